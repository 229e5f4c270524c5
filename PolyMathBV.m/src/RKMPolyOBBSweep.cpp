// RKMPolyOBB's directional distances: how far one volume travels along a direction before it meets
// another. They stand apart from the box's other members for their length.

#include "RKMPolyOBB.h"

#include "RKMPolyLineBoxDistance.h"

#include <algorithm>
#include <cfloat>
#include <cmath>

namespace
{
constexpr double kSlack = 64 * DBL_EPSILON;
constexpr double kNoHit = 1e49;

// The travels τ along the unit direction d for which two boxes overlap form one interval: boxes
// overlap exactly when none of the 15 axes separates them, and along each axis the condition
// |p + τ·q| ≤ r is itself an interval of τ. Returns false when the intersection is empty.
bool TravelInterval(const RKMMathOBBBase &a, const RKMMathOBBBase &b, const RKMMathVector &d, double &lo,
                    double &hi)
{
  lo = -HUGE_VAL;
  hi = HUGE_VAL;
  const RKMMathVector offset = b.Center() - a.Center();
  const double scale = std::fabs(offset.x) + std::fabs(offset.y) + std::fabs(offset.z) + a.Diagonal().x +
                       a.Diagonal().y + a.Diagonal().z + b.Diagonal().x + b.Diagonal().y + b.Diagonal().z;
  auto axis = [&](const RKMMathVector &L) {
    const double length = L.Norm();
    if (length < 1e-9)
      return true;
    double r = 0.0;
    for (int i = 0; i < 3; ++i)
      r += a.Diagonal()[i] * std::fabs(a.Axis(i) * L) + b.Diagonal()[i] * std::fabs(b.Axis(i) * L);
    r += kSlack * scale * length;
    const double p = offset * L, q = d * L;
    if (std::fabs(q) <= 1e-15 * length)
      return std::fabs(p) <= r;
    double t0 = (-r - p) / q, t1 = (r - p) / q;
    if (t0 > t1)
      std::swap(t0, t1);
    lo = std::fmax(lo, t0);
    hi = std::fmin(hi, t1);
    return lo <= hi;
  };
  for (int i = 0; i < 3; ++i)
    if (!axis(a.Axis(i)) || !axis(b.Axis(i)))
      return false;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      if (!axis(a.Axis(i) ^ b.Axis(j)))
        return false;
  return lo <= hi;
}

double SmallestSquare(double lo, double hi)
{
  if (lo <= 0.0 && hi >= 0.0)
    return 0.0;
  const double t = lo > 0.0 ? lo : hi;
  return t * t;
}

}

unsigned char RKMPolyOBB::SquareDistanceMinDir(const RKMPolyOBB &other, const RKMMathVector &direction,
                                               double &squareDistance) const
{
  if (!(direction.SquareNorm() > 1e-6) || !IsDefined() || !other.IsDefined())
    return 0;
  RKMMathVector d = direction;
  if (FAILED(d.Normalize()))
    return 0;
  squareDistance = kNoHit;
  double lo, hi;
  if (!TravelInterval(m_base, other.m_base, d, lo, hi))
    return 0;
  squareDistance = SmallestSquare(lo, hi);
  return 1;
}

unsigned char RKMPolyOBB::SquareDistanceMinDir(const RKMMathPoint &center, double radius,
                                               const RKMMathVector &direction, double &squareDistance) const
{
  if (!IsDefined() || !(radius >= 0.0))
    return 0;
  const double r2 = radius * radius;
  if (m_base.SquareDistanceTo(center) <= r2)
  {
    squareDistance = 0.0;
    return 1;
  }
  RKMMathVector d = direction;
  if (!(direction.SquareNorm() > 1e-6) || FAILED(d.Normalize()))
    return 0;
  squareDistance = kNoHit;
  // In the box frame the squared distance g(τ) of the moving centre to the box is convex and piecewise
  // quadratic, with breaks where a coordinate crosses a face. Its minimum is at a break or at the vertex
  // of a piece; the contact nearest to τ = 0 is then found by bisection on the side of 0.
  const RKMMathPoint p = m_base.XYZtoUVW(center);
  const RKMMathVector q(d * m_base.U(), d * m_base.V(), d * m_base.W());
  const RKMMathVector &h = m_base.Diagonal();
  double best;
  const double bestValue = RKMPolyLineBoxDistance::LineSquare(p, q, 0.0, h, best);
  if (bestValue > r2 * (1.0 + 1e-12))
    return 0;
  // g(0) > r² ≥ g(best): bisect for the contact between them; the outer end of the bracket is kept,
  // so the travel reported is never more than the true one.
  double outside = 0.0, inside = best;
  for (int iter = 0; iter < 200 && outside != inside; ++iter)
  {
    const double mid = 0.5 * (outside + inside);
    if (mid == outside || mid == inside)
      break;
    if (RKMPolyLineBoxDistance::PointSquare(p, q, h, mid) <= r2)
      inside = mid;
    else
      outside = mid;
  }
  squareDistance = outside * outside;
  return 1;
}
