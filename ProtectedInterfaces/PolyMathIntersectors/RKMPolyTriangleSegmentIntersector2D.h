#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersection.h"
#include "RKMPolyIntersectionPoint.h"

class RKMMathPoint2D;
class RKMPolyExactArithmetic;

/// Exact intersection of a triangle and a segment in the plane: the ends of the overlap of the segment
/// with the closed triangle, each described on the triangle (slot 0) and on the segment (slot 1, its
/// vertices 0 and 1, its interior bar 0), in the caller's numbering and in the segment's direction.
/// The arithmetic must outlive the intersector.
class RKM_EXPORT RKMPolyTriangleSegmentIntersector2D
{
public:
  explicit RKMPolyTriangleSegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic);
  RKMPolyTriangleSegmentIntersector2D(const RKMPolyTriangleSegmentIntersector2D &other) = default;
  RKMPolyTriangleSegmentIntersector2D &operator=(const RKMPolyTriangleSegmentIntersector2D &other) = default;

  /// The number of points: ResultDisjoint (0), ResultOnePoint (1) or ResultTwoPoints (2);
  /// ResultPointSegment (-5) when the segment is a single point, ResultDegenerateTriangle (-6) when
  /// the triangle is degenerate.
  int Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c, const RKMMathPoint2D &p,
                const RKMMathPoint2D &q);
  /// n receives the count; null when there is no point.
  const RKMPolyIntersectionPoint *GetIntersectionPoints(int &n) const;

private:
  const RKMPolyExactArithmetic *m_arithmetic;
  int m_count = 0;
  RKMPolyIntersectionPoint m_points[2];
};
