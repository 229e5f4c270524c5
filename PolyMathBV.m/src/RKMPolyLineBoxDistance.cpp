#include "RKMPolyLineBoxDistance.h"

#include <algorithm>
#include <cmath>

namespace RKMPolyLineBoxDistance
{
double PointSquare(const RKMMathPoint &c, const RKMMathVector &a, const RKMMathVector &h, double s)
{
  double sum = 0.0;
  for (int i = 0; i < 3; ++i)
  {
    const double e = std::fabs(c[i] + s * a[i]) - h[i];
    if (e > 0.0)
      sum += e * e;
  }
  return sum;
}

// The squared distance is convex and piecewise quadratic in s, with breaks where a coordinate crosses
// a face; its minimum is at a break, at an end of the segment, or at the vertex of a piece, and all of
// them are tried.
double LineSquare(const RKMMathPoint &c, const RKMMathVector &a, double L, const RKMMathVector &h, double &where)
{
  const bool infinite = !(L > 0.0);
  auto clamp = [&](double s) { return infinite ? s : std::fmax(-L, std::fmin(L, s)); };
  double breaks[16];
  int n = 0;
  for (int i = 0; i < 3; ++i)
    if (a[i] != 0.0)
    {
      breaks[n++] = clamp((h[i] - c[i]) / a[i]);
      breaks[n++] = clamp((-h[i] - c[i]) / a[i]);
    }
  if (!infinite)
  {
    breaks[n++] = -L;
    breaks[n++] = L;
  }
  std::sort(breaks, breaks + n);
  where = 0.0;
  double best = PointSquare(c, a, h, 0.0);
  auto consider = [&](double s) {
    if (!std::isfinite(s))
      return;
    const double v = PointSquare(c, a, h, s);
    if (v < best)
    {
      best = v;
      where = s;
    }
  };
  for (int k = 0; k < n; ++k)
    consider(breaks[k]);
  // Between consecutive breaks (and beyond the outer ones on a line) the active axes are fixed; the
  // piece's quadratic has its minimum at Σ a_i (b_i − c_i) / Σ a_i² over them.
  for (int k = 0; k <= n; ++k)
  {
    if (!infinite && (k == 0 || k == n))
      continue;
    const double left = k == 0 ? (n ? breaks[0] - 1.0 : -1.0) : breaks[k - 1];
    const double right = k == n ? (n ? breaks[n - 1] + 1.0 : 1.0) : breaks[k];
    const double mid = 0.5 * (left + right);
    double num = 0.0, den = 0.0;
    for (int i = 0; i < 3; ++i)
    {
      const double x = c[i] + mid * a[i];
      if (std::fabs(x) > h[i])
      {
        num += a[i] * ((x > 0.0 ? h[i] : -h[i]) - c[i]);
        den += a[i] * a[i];
      }
    }
    if (den > 0.0)
      consider(clamp(num / den));
  }
  return best;
}
} // namespace RKMPolyLineBoxDistance
