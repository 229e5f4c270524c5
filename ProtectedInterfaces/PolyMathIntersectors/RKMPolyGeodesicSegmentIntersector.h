#pragma once

#include "RKMPolyIntersection.h"
#include "RKMPolyTriangleIntersector.h"

/// Segments ab and cd compared as seen from an apex O, as the triangles O a b and O c d. The apex is
/// held by address and must outlive the intersector (a temporary cannot be given).
class RKM_EXPORT RKMPolyGeodesicSegmentIntersector : public RKMPolyTriangleIntersector
{
public:
  RKMPolyGeodesicSegmentIntersector(const RKMPolyExactArithmetic &arithmetic, const RKMMathPoint &apex);
  RKMPolyGeodesicSegmentIntersector(const RKMPolyExactArithmetic &arithmetic, RKMMathPoint &&apex) = delete;

  /// ResultDisjoint (0) when the triangles share only the apex; ResultOnePoint (1) when they meet
  /// along a segment from it (the segment features are then set); ResultTwoPoints (2) when coplanar
  /// and overlapping; ResultInadmissible (-2) when apart or on a sign combination not admitted;
  /// ResultPointSegment (-5) when a segment is collinear with O on one side of it, ResultApexBetween
  /// (-8) when O lies between its ends; ResultUndetermined (-1) otherwise.
  int Intersect(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c, const RKMMathPoint &d);
  /// 1 when the last pair was found coplanar with O.
  unsigned char AreSegmentsColinear() const { return m_colinear; }
  /// Whether p lies within the angular sector at O between the rays towards a and b; 0 when O, a
  /// and b are collinear.
  unsigned char IsPointWithinSector(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &p) const;
  /// Segment i's feature after ResultOnePoint: type 1 vertex (with its index) or 2 interior; -1 for
  /// another i.
  int GetEntityType(int i) const { return i == 0 || i == 1 ? m_type[i] : -1; }
  int GetVertexIndex(int i) const { return i == 0 || i == 1 ? m_vertex[i] : -1; }
  /// Orientation3D(O, p, q, r).
  int Determinant(const RKMMathPoint &p, const RKMMathPoint &q, const RKMMathPoint &r) const;

private:
  void ApplyFeatures(const RKMPolyIntersectionPoint &pt);

  const RKMMathPoint *m_apex;
  unsigned char m_colinear = 0;
  int m_result = RKMPolyIntersection::ResultUndetermined;
  int m_type[2] = {0, 0};
  int m_vertex[2] = {0, 0};
};
