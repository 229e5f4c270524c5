#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersection.h"
#include "RKMSysTypes.h"

class RKMMathPoint2D;
class RKMPolyExactArithmetic;
class RKMPolyIntersectionPointConstructor2D;

/// Exact intersection of segments ab and cd in the plane. The arithmetic and the optional point
/// constructor are not owned and must outlive the intersector. ConstructIntersection and
/// GetClosestExtremity refer to the last Intersect and must be given the same four points.
class RKM_EXPORT RKMPolySegmentIntersector2D
{
public:
  explicit RKMPolySegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic);
  /// A null arithmetic makes every query answer ResultUndetermined.
  explicit RKMPolySegmentIntersector2D(const RKMPolyExactArithmetic *arithmetic);
  RKMPolySegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic,
                              const RKMPolyIntersectionPointConstructor2D &constructor);

  /// ResultDisjoint (0); ResultOnePoint (1) for one common point; ResultTwoPoints (2) for a collinear
  /// overlap, identical segments included; ResultPointSegment (-5) when a segment is a single point;
  /// ResultUndetermined (-1) without an arithmetic.
  int Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c, const RKMMathPoint2D &d);
  /// The same, with the result also as a (type, error) pair.
  int Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                RKMPolyIntersection::Type &type, RKMPolyIntersection::Error &error);

  /// 1 when the last two segments were found on one line.
  unsigned char AreSegmentsColinear() const { return m_colinear; }
  /// After ResultOnePoint, the feature of segment i (0 for ab, 1 for cd) holding the point: 1 a vertex,
  /// 2 its interior; 0 otherwise.
  int GetEntityType(int i) const { return i == 0 || i == 1 ? m_type[i] : 0; }
  /// The vertex (0 or 1) of segment i when its entity type is 1, else -1.
  int GetVertexIndex(int i) const { return GetEntityType(i) == 1 ? m_vertex[i] : -1; }

  /// The coordinates of the common point after ResultOnePoint: the shared extremity, or a constructed
  /// point (snapped in the Gridded mode); E_FAIL otherwise.
  HRESULT ConstructIntersection(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                const RKMMathPoint2D &d, RKMMathPoint2D &out) const;
  /// After ResultOnePoint, which extremity (1 to 4 for a, b, c, d) lies closest to the other segment's
  /// line; after ResultTwoPoints, the first of c, d, a, b lying strictly inside the other segment (0
  /// for none); E_FAIL after any other answer.
  HRESULT GetClosestExtremity(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                              const RKMMathPoint2D &d, int &which) const;

private:
  int Join(const RKMMathPoint2D &p, const RKMMathPoint2D &s, const RKMMathPoint2D &q, int i0, int i1);
  void SetFeature(int i, int type, int vertex);

  const RKMPolyExactArithmetic *m_arithmetic;
  const RKMPolyIntersectionPointConstructor2D *m_constructor = nullptr;
  unsigned char m_colinear = 0;
  int m_result = RKMPolyIntersection::ResultUndetermined;
  int m_type[2] = {0, 0};
  int m_vertex[2] = {0, 0};
};
