#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersection.h"
#include "RKMPolyIntersectionPoint.h"

class RKMMathPoint2D;
class RKMPolyExactArithmetic;

/// Exact intersection of two triangles in the plane: the vertices of the intersection polygon (at most
/// six), each described on the first triangle (slot 0) and on the second (slot 1) in the caller's
/// numbering, in the first triangle's orientation. The arithmetic must outlive the intersector, which
/// may be copied and assigned freely.
class RKM_EXPORT RKMPolyTriangleIntersector2D
{
public:
  explicit RKMPolyTriangleIntersector2D(const RKMPolyExactArithmetic &arithmetic);
  RKMPolyTriangleIntersector2D(const RKMPolyTriangleIntersector2D &other) = default;
  RKMPolyTriangleIntersector2D &operator=(const RKMPolyTriangleIntersector2D &other) = default;
  ~RKMPolyTriangleIntersector2D() = default;

  /// ResultPolygon (3) when the intersection has three or more vertices, ResultTwoPoints (2) for a
  /// segment, ResultOnePoint (1) for a point, ResultDisjoint (0) when disjoint,
  /// ResultDegenerateTriangle (-6) when a triangle is degenerate.
  int Intersect(const RKMMathPoint2D &a1, const RKMMathPoint2D &b1, const RKMMathPoint2D &c1, const RKMMathPoint2D &a2,
                const RKMMathPoint2D &b2, const RKMMathPoint2D &c2);
  /// Each pointer addresses three points; a null one counts as a degenerate triangle.
  int Intersect(const RKMMathPoint2D *t1, const RKMMathPoint2D *t2);
  /// The same answer by the same walk; kept for callers of the region-case entry point.
  int IntersectInConvergence(const RKMMathPoint2D *t1, const RKMMathPoint2D *t2);
  /// n receives the count; null when there is no point.
  const RKMPolyIntersectionPoint *GetIntersectionPoints(int &n) const;
  /// 1 when both triangles of the last query run the same way round.
  unsigned char HaveSameOrientation() const { return m_orientation[0] * m_orientation[1] > 0; }

private:
  /// Edge i of the first triangle against edge j of the second; links between records are indices,
  /// so copies stay consistent.
  struct Crossing
  {
    int i = 0, j = 0;
    int code[2] = {3, 3};
    int inner = -1;
    int nextTriangle = -1, nextEdge = -1;
  };

  void FillCrossings();
  void Continue(Crossing &r) const;
  int Inner(int i, int j) const;
  RKMPolyIntersectionPoint CrossingPoint(const Crossing &r) const;
  bool VertexPoint(int t, int v, RKMPolyIntersectionPoint &pt) const;
  /// The one or two corners of a contact without interior, else 0.
  int TouchingContact(RKMPolyIntersectionPoint *pts) const;

  const RKMPolyExactArithmetic *m_arithmetic;
  int m_count = 0;
  RKMPolyIntersectionPoint m_points[6];
  /// m_sign[t][v][e]: vertex v of triangle t against the directed line of edge e of the other one,
  /// positive on its inner side.
  int m_sign[2][3][3] = {};
  int m_orientation[2] = {0, 0};
  int m_enter[2][3] = {{-1, -1, -1}, {-1, -1, -1}};
  int m_exit[2][3] = {{-1, -1, -1}, {-1, -1, -1}};
  Crossing m_crossings[9];
};
