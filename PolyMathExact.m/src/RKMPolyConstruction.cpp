#include "RKMPolyConstruction.h"

#include <cmath>

#include "RKMMathBox.h"
#include "RKMMathPlane.h"
#include "RKMMathPoint.h"
#include "RKMMathVector.h"
#include "RKMPolyExactArithmetic.h"

namespace
{
RKMMathBox BoxOf(const RKMMathPoint &a, const RKMMathPoint &b)
{
  RKMMathBox box;
  box.AddInside(a);
  box.AddInside(b);
  return box;
}

// v scaled by a power of two so that its largest component lies in [1, 2): only a direction is
// needed from it, and the products formed with it then neither overflow nor underflow where the
// coordinates themselves are huge or tiny. Zero and non-finite vectors are returned as they are.
RKMMathVector Direction(const RKMMathVector &v)
{
  const double m = std::fmax(std::fabs(v.x), std::fmax(std::fabs(v.y), std::fabs(v.z)));
  if (!(m > 0.0) || !std::isfinite(m))
    return v;
  const int e = std::ilogb(m);
  return RKMMathVector(std::scalbn(v.x, -e), std::scalbn(v.y, -e), std::scalbn(v.z, -e));
}

bool IsFinite(const RKMMathPoint &p)
{
  return std::isfinite(p.x) && std::isfinite(p.y) && std::isfinite(p.z);
}

// The fraction |d0| / (|d0| + |d1|) of the way from the first end to the second, where the signed
// distances d0 and d1 of the ends change sign. False when both ends are on the plane, or when the
// sum is not a finite positive number (a NaN or an overflow would otherwise pass as a point).
bool CrossingFraction(double d0, double d1, double &t)
{
  const double sum = std::fabs(d1) + std::fabs(d0);
  if (!(sum > 0.0) || !std::isfinite(sum))
    return false;
  t = std::fabs(d0) / sum;
  return std::isfinite(t);
}

// first + t·(second − first). At t = 1 (the second end on the plane, or rounding beyond it) the
// second end itself: rebuilding it as first + (second − first) could round off it.
RKMMathPoint Interpolate(const RKMMathPoint &first, const RKMMathPoint &second, double t)
{
  if (t >= 1.0)
    return second;
  return RKMMathPoint((second.x - first.x) * t + first.x, (second.y - first.y) * t + first.y,
                      (second.z - first.z) * t + first.z);
}
} // namespace

HRESULT RKMPolyConstruction::ConstructIntersection(const RKMMathPoint &p, const RKMMathPoint &q, const RKMMathPoint &a,
                                                   const RKMMathPoint &b, const RKMMathPoint &c, RKMMathPoint &out)
{
  const RKMMathVector n = Direction(Direction(b - a) ^ Direction(c - a));
  double t;
  if (!CrossingFraction((p - a) * n, (q - a) * n, t))
    return E_FAIL;
  RKMMathPoint r = Interpolate(p, q, t);
  ProjectToBoundingBox(BoxOf(p, q), r);
  RKMMathBox abc = BoxOf(a, b);
  abc.AddInside(c);
  ProjectToBoundingBox(abc, r);
  if (!IsFinite(r))
    return E_FAIL;
  out = r;
  return S_OK;
}

HRESULT RKMPolyConstruction::ConstructIntersection(const RKMMathPoint &p0, const RKMMathPoint &p1,
                                                   const RKMMathPoint &q0, const RKMMathPoint &q1, RKMMathPoint &out)
{
  const RKMMathVector d0 = Direction(p1 - p0);
  const RKMMathVector d1 = Direction(q1 - q0);
  const RKMMathVector n = d0 ^ d1;
  // Drop the axis along which the normal is largest; the kept pair (u, v) follows the cyclic order.
  int k = 0;
  if (std::fabs(n.y) > std::fabs(n.x))
    k = 1;
  if (std::fabs(n.z) > std::fabs(n[k]))
    k = 2;
  if (n[k] == 0.0)
    return E_FAIL;
  const int u = (k + 1) % 3, v = (k + 2) % 3;
  const double mu = -d0[v], mv = d0[u];
  const double sq0 = (q0[u] - p0[u]) * mu + (q0[v] - p0[v]) * mv;
  const double sq1 = (q1[u] - p0[u]) * mu + (q1[v] - p0[v]) * mv;
  double t;
  if (!CrossingFraction(sq0, sq1, t))
    return E_FAIL;
  RKMMathPoint r = Interpolate(q0, q1, t);
  ProjectToBoundingBox(BoxOf(p0, p1), r);
  ProjectToBoundingBox(BoxOf(q0, q1), r);
  if (!IsFinite(r))
    return E_FAIL;
  out = r;
  return S_OK;
}

HRESULT RKMPolyConstruction::ConstructIntersection(const RKMMathPoint &p, const RKMMathPoint &q,
                                                   const RKMMathPlane &plane, RKMMathPoint &out)
{
  // A fixed order of the ends makes the point independent of the order the caller gives them in.
  const bool pFirst = RKMPolyCompareLeftRight(p, q) < 0;
  const RKMMathPoint &first = pFirst ? p : q;
  const RKMMathPoint &second = pFirst ? q : p;
  const RKMMathPoint &o = plane.GetOrigin();
  const RKMMathVector nn = plane.GetNormal();
  double t;
  if (!CrossingFraction((first - o) * nn, (second - o) * nn, t))
    return E_FAIL;
  RKMMathPoint r = Interpolate(first, second, t);
  ProjectToBoundingBox(BoxOf(first, second), r);
  if (!IsFinite(r))
    return E_FAIL;
  out = r;
  return S_OK;
}

void RKMPolyConstruction::ProjectToBoundingBox(const RKMMathBox &box, RKMMathPoint &p)
{
  double l[6];
  box.GetExtremities(l[0], l[1], l[2], l[3], l[4], l[5]);
  for (int k = 0; k < 3; ++k)
  {
    double v = p[k];
    if (l[2 * k] > v)
      v = l[2 * k];
    if (v > l[2 * k + 1])
      v = l[2 * k + 1];
    p[k] = v;
  }
}
