#pragma once

#include "RKMMathPoint.h"
#include "RKMMathVector.h"

namespace RKMPolyLineBoxDistance
{
/// Squared distance from the point c + s·a to the box [−h, h], all in the box's own frame.
double PointSquare(const RKMMathPoint &c, const RKMMathVector &a, const RKMMathVector &h, double s);

/// The smallest squared distance from the segment c + s·a, |s| ≤ L, to the box [−h, h] (every s, a
/// whole line, when L is not positive), and in `where` an s that reaches it: 0 unless another
/// candidate does strictly better.
double LineSquare(const RKMMathPoint &c, const RKMMathVector &a, double L, const RKMMathVector &h, double &where);
} // namespace RKMPolyLineBoxDistance
