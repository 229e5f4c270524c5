#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersection.h"
#include "RKMPolyIntersectionPoint.h"

class RKMMathPoint;
class RKMPolyExactArithmetic;
class RKMPolyTriangleIntersector2D;

/// Exact intersection of two triangles in space, with the features that carry it: the one or two
/// ends of the intersection segment, each described on the first triangle (slot 0) and the second
/// (slot 1) in the caller's numbering. Coplanar pairs are projected onto a coordinate plane and
/// answered by a 2D intersector the object owns. The arithmetic must outlive the intersector; a null
/// one makes every query answer ResultUndetermined.
class RKM_EXPORT RKMPolyTriangleIntersector
{
public:
  explicit RKMPolyTriangleIntersector(const RKMPolyExactArithmetic &arithmetic);
  explicit RKMPolyTriangleIntersector(const RKMPolyExactArithmetic *arithmetic);
  /// Copies own their own 2D intersector.
  RKMPolyTriangleIntersector(const RKMPolyTriangleIntersector &other);
  RKMPolyTriangleIntersector &operator=(const RKMPolyTriangleIntersector &other);
  virtual ~RKMPolyTriangleIntersector();

  /// ResultOnePoint (1) or ResultTwoPoints (2): the number of points; ResultDisjoint (0); after a
  /// coplanar pair the 2D intersector's answer (ResultPolygon (3), ResultTwoPoints, ResultOnePoint,
  /// ResultDisjoint), or ResultDegenerateTriangle (-6) for a degenerate first triangle;
  /// ResultDegenerateTriangle when only the second triangle lies in the first's plane;
  /// ResultInadmissible (-2) for a sign combination the classification does not admit;
  /// ResultUndetermined (-1) without an arithmetic.
  int Intersect(const RKMMathPoint &a1, const RKMMathPoint &b1, const RKMMathPoint &c1, const RKMMathPoint &a2,
                const RKMMathPoint &b2, const RKMMathPoint &c2);
  /// Each pointer addresses three points.
  int Intersect(const RKMMathPoint *t1, const RKMMathPoint *t2);
  /// Triangles s b1 c1 and s b2 c2 sharing vertex s; the same answers, with ResultInadmissible where
  /// the six-point test would find them apart.
  int Intersect(const RKMMathPoint &s, const RKMMathPoint &b1, const RKMMathPoint &c1, const RKMMathPoint &b2,
                const RKMMathPoint &c2);
  /// The points of the last query (the 2D intersector's after a coplanar one); null when none.
  const RKMPolyIntersectionPoint *GetIntersectionPoints(int &n) const;
  /// 1 when the last pair was coplanar (also when the second triangle was degenerate in the first's
  /// plane).
  unsigned char AreTrianglesCoplanar() const { return m_count == -1; }
  /// After a coplanar query, 1 when the two projected triangles turn the same way.
  unsigned char HaveSameOrientation() const;
  /// Orientation3D of the arithmetic.
  int GetPosition(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c, const RKMMathPoint &d) const;

protected:
  const RKMPolyExactArithmetic *m_arithmetic;

private:
  int Classify(const RKMMathPoint *T1, const RKMMathPoint *T2, const int *sigma1, const int *sigma2, bool sharedApex);
  int Coplanar(const RKMMathPoint *T1, const RKMMathPoint *T2);

  RKMPolyTriangleIntersector2D *m_intersector2D;
  int m_count = 0;
  /// The 2D intersector answered the last coplanar query, so its points are the answer.
  bool m_planarAnswer = false;
  RKMPolyIntersectionPoint m_points[2];
};
