#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersection.h"
#include "RKMPolyIntersectionPoint.h"

class RKMMathPoint;
class RKMPolyExactArithmetic;
class RKMPolyTriangleSegmentIntersector2D;

/// Exact intersection of a triangle (slot 0) and a segment (slot 1: vertices 0 and 1 its ends, bar 0
/// its interior) in space. A segment in the triangle's plane is answered by a 2D intersector the
/// object owns. The arithmetic must outlive the intersector; a null one makes every query answer
/// ResultUndetermined.
class RKM_EXPORT RKMPolyTriangleSegmentIntersector
{
public:
  explicit RKMPolyTriangleSegmentIntersector(const RKMPolyExactArithmetic &arithmetic);
  explicit RKMPolyTriangleSegmentIntersector(const RKMPolyExactArithmetic *arithmetic);
  /// Copies own their own 2D intersector.
  RKMPolyTriangleSegmentIntersector(const RKMPolyTriangleSegmentIntersector &other);
  RKMPolyTriangleSegmentIntersector &operator=(const RKMPolyTriangleSegmentIntersector &other);
  ~RKMPolyTriangleSegmentIntersector();

  /// ResultOnePoint (1) when they meet in one point, ResultDisjoint (0) when not; for a segment in the
  /// triangle's plane the 2D intersector's answer (ResultDisjoint, ResultOnePoint, ResultTwoPoints (2),
  /// ResultPointSegment (-5) for a single-point segment); ResultDegenerateTriangle (-6) for a
  /// degenerate triangle; ResultUndetermined (-1) without an arithmetic.
  int Intersect(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c, const RKMMathPoint &p,
                const RKMMathPoint &q);
  /// The point of the last query (the 2D intersector's after a coplanar one); null when none.
  const RKMPolyIntersectionPoint *GetIntersectionPoints(int &n) const;
  /// 1 when the last segment lay in the triangle's plane.
  unsigned char IsCoplanar() const { return m_count == -1; }

private:
  const RKMPolyExactArithmetic *m_arithmetic;
  RKMPolyTriangleSegmentIntersector2D *m_intersector2D;
  int m_count = 0;
  /// The 2D intersector answered the last coplanar query, so its points are the answer.
  bool m_planarAnswer = false;
  RKMPolyIntersectionPoint m_point;
};
