#pragma once

#include "RKMMathPoint2D.h"

#include <cmath>

// The order of points along a segment, read on its main axis: shared by the segment and the point
// against segment intersectors.
namespace RKMPolySegmentAxis2D
{
/// The axis (0 for x, 1 for y) along which b − a is larger; x on ties.
inline int MainAxis(const RKMMathPoint2D &a, const RKMMathPoint2D &b)
{
  return std::fabs(b.y - a.y) > std::fabs(b.x - a.x) ? 1 : 0;
}

inline double Coord(const RKMMathPoint2D &p, int axis)
{
  return axis ? p.y : p.x;
}

/// v strictly between the coordinates of a and b along the axis.
inline bool StrictlyInside(double v, double a, double b)
{
  return a < b ? (a < v && v < b) : (b < v && v < a);
}
}
