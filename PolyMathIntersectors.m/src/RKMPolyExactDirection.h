#pragma once

#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMMathVector.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactPredicates.h"

// The direction code of triangle abc for projecting it onto a coordinate plane, with the exactness of
// the arithmetic: the axis is the dominant one of the normal computed in doubles when the exact
// normal has a non-zero component there, otherwise the first axis where it has one; the sign is the
// exact sign of that component. 0 only for a degenerate triangle. A normal computed in doubles alone
// can round to zero, overflow or underflow on a proper triangle.
inline int RKMPolyExactTriangleDirection(const RKMPolyExactArithmetic &arithmetic, const RKMMathPoint &a,
                                         const RKMMathPoint &b, const RKMMathPoint &c)
{
  // Projected along +axis, the triangle's 2D orientation is the sign of the normal's component.
  auto exactSign = [&](int axis) {
    RKMMathPoint2D a2, b2, c2;
    RKMPolyProjectOntoCartesianPlane(axis, a, a2);
    RKMPolyProjectOntoCartesianPlane(axis, b, b2);
    RKMPolyProjectOntoCartesianPlane(axis, c, c2);
    return arithmetic.Orientation2D(a2, b2, c2);
  };
  const int estimate = RKMPolyGetMainTriangleDirection(a, b, c);
  const int axis = estimate < 0 ? -estimate : estimate;
  if (axis != 0)
    if (const int s = exactSign(axis))
      return s * axis;
  for (int k = 1; k <= 3; ++k)
    if (const int s = exactSign(k))
      return s * k;
  return 0;
}
