#include "RKMPolyIntersectionPointClosestPointConstructor2D.h"
#include "RKMPolyIntersectionPointDefaultConstructor2D.h"

#include <cmath>

#include "RKMMathPoint2D.h"

namespace
{
// Into the box of a and b; a NaN coordinate stays NaN, for the caller to reject.
void Clamp(const RKMMathPoint2D &a, const RKMMathPoint2D &b, RKMMathPoint2D &p)
{
  auto clamp = [](double v, double e0, double e1) {
    const double lo = e0 < e1 ? e0 : e1, hi = e0 < e1 ? e1 : e0;
    if (lo > v)
      v = lo;
    if (v > hi)
      v = hi;
    return v;
  };
  p.x = clamp(p.x, a.x, b.x);
  p.y = clamp(p.y, a.y, b.y);
}
} // namespace

RKMPolyIntersectionPointDefaultConstructor2D::RKMPolyIntersectionPointDefaultConstructor2D(double tolerance)
    : m_tolerance(tolerance)
{
}

HRESULT RKMPolyIntersectionPointDefaultConstructor2D::Compute(const RKMMathPoint2D &a, const RKMMathPoint2D &b,
                                                              const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                                                              RKMMathPoint2D &out) const
{
  if (RKMPolyIntersectionPointClosestPointConstructor2D(m_tolerance).Compute(a, b, c, d, out) == S_OK)
    return S_OK;
  // Only the direction of the normal matters: scaled by a power of two to unit size, the products
  // below neither overflow nor underflow where the coordinates are huge or tiny.
  RKMMathVector2D n(a.y - b.y, b.x - a.x);
  const double m = std::fmax(std::fabs(n.x), std::fabs(n.y));
  if (m > 0.0 && std::isfinite(m))
    n = RKMMathVector2D(std::scalbn(n.x, -std::ilogb(m)), std::scalbn(n.y, -std::ilogb(m)));
  const double sc = std::fabs((c - a) * n);
  const double sd = std::fabs((d - a) * n);
  const double sum = sc + sd;
  // A NaN or an overflow must not pass as a point.
  if (!(sum > 0.0) || !std::isfinite(sum))
    return E_FAIL;
  RKMMathPoint2D p = c + (d - c) * (sc / sum);
  Clamp(a, b, p);
  Clamp(c, d, p);
  if (!std::isfinite(p.x) || !std::isfinite(p.y))
    return E_FAIL;
  out = p;
  return S_OK;
}
