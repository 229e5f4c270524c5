#include "RKMPolyOBB.h"

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

// Squared distance from the point p + τ·q (local coordinates) to the box [−h, h].
double Excess(const RKMMathPoint &p, const RKMMathVector &q, const RKMMathVector &h, double tau)
{
  double s = 0.0;
  for (int i = 0; i < 3; ++i)
  {
    const double e = std::fabs(p[i] + tau * q[i]) - h[i];
    if (e > 0.0)
      s += e * e;
  }
  return s;
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
  double candidates[16];
  int n = 0;
  for (int i = 0; i < 3; ++i)
    if (q[i] != 0.0)
    {
      candidates[n++] = (h[i] - p[i]) / q[i];
      candidates[n++] = (-h[i] - p[i]) / q[i];
    }
  std::sort(candidates, candidates + n);
  double best = 0.0, bestValue = Excess(p, q, h, 0.0);
  auto consider = [&](double tau) {
    if (!std::isfinite(tau))
      return;
    const double v = Excess(p, q, h, tau);
    if (v < bestValue)
    {
      bestValue = v;
      best = tau;
    }
  };
  for (int k = 0; k < n; ++k)
    consider(candidates[k]);
  // Vertex of each piece: between consecutive breaks (and beyond the outer ones) the active axes are
  // fixed; the piece's quadratic has its minimum at Σ q_i (b_i − p_i) / Σ q_i² over them.
  for (int k = 0; k <= n; ++k)
  {
    const double left = k == 0 ? (n ? candidates[0] - 1.0 : -1.0) : candidates[k - 1];
    const double right = k == n ? (n ? candidates[n - 1] + 1.0 : 1.0) : candidates[k];
    const double mid = 0.5 * (left + right);
    double num = 0.0, den = 0.0;
    for (int i = 0; i < 3; ++i)
    {
      const double x = p[i] + mid * q[i];
      if (std::fabs(x) > h[i])
      {
        const double bound = x > 0.0 ? h[i] : -h[i];
        num += q[i] * (bound - p[i]);
        den += q[i] * q[i];
      }
    }
    if (den > 0.0)
      consider(num / den);
  }
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
    if (Excess(p, q, h, mid) <= r2)
      inside = mid;
    else
      outside = mid;
  }
  squareDistance = outside * outside;
  return 1;
}
