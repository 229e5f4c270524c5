#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersection.h"
#include "RKMSysTypes.h"

class RKMMathPoint2D;
class RKMPolyExactArithmetic;

/// Exact test of a point against a segment in the plane; the arithmetic must outlive it.
class RKM_EXPORT RKMPolyPointSegmentIntersector2D
{
public:
  explicit RKMPolyPointSegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic);
  /// S_OK when p lies on the closed segment ab, with type TypePoint and where 1 (at a), 2 (inside, or
  /// on a single-point segment) or 3 (at b); S_FALSE otherwise, with type TypeNone and where 0 (for a
  /// single-point segment away from p, type and where are left as they were). error is ErrorDegenerate
  /// for a single-point segment, else ErrorNone. where may be null.
  HRESULT Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &p,
                    RKMPolyIntersection::Type &type, RKMPolyIntersection::Error &error, int *where) const;

private:
  const RKMPolyExactArithmetic *m_arithmetic;
};
