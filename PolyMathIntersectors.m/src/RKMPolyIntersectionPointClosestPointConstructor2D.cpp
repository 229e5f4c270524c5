#include "RKMPolyIntersectionPointClosestPointConstructor2D.h"

#include "RKMMathBox2D.h"
#include "RKMMathConstants.h"
#include "RKMMathPoint2D.h"

namespace
{
// Squared distance from p to the line through a and b, or to a when a equals b.
double SqDistanceToLine(const RKMMathPoint2D &p, const RKMMathPoint2D &a, const RKMMathPoint2D &b)
{
  const RKMMathVector2D u = b - a, w = p - a;
  const double uu = u.SquareNorm();
  if (!(uu > 0.0))
    return w.SquareNorm();
  const double cross = u ^ w;
  return cross * cross / uu;
}

// The closest extremity, with those outside the other segment's closed box counting as infinitely
// far when outsideIsFar is set.
int ClosestExtremity(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                     const RKMMathPoint2D &d, bool outsideIsFar, double &sqDistance)
{
  const RKMMathPoint2D *ends[4] = {&a, &b, &c, &d};
  RKMMathBox2D boxAB, boxCD;
  boxAB.AddInside(a);
  boxAB.AddInside(b);
  boxCD.AddInside(c);
  boxCD.AddInside(d);
  int best = 0;
  double bestD = 0.0;
  for (int k = 0; k < 4; ++k)
  {
    const bool onAB = k < 2;
    const RKMMathPoint2D &l0 = onAB ? c : a, &l1 = onAB ? d : b;
    double dist = SqDistanceToLine(*ends[k], l0, l1);
    if (outsideIsFar && !(onAB ? boxCD : boxAB).IsContaining(*ends[k]))
      dist = RKMMathInfinite;
    if (k == 0 || dist < bestD)
    {
      best = k;
      bestD = dist;
    }
  }
  sqDistance = bestD;
  return best + 1;
}

const RKMMathPoint2D &Extremity(int which, const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                const RKMMathPoint2D &d)
{
  switch (which)
  {
  case 1:
    return a;
  case 2:
    return b;
  case 3:
    return c;
  default:
    return d;
  }
}
} // namespace

RKMPolyIntersectionPointClosestPointConstructor2D::RKMPolyIntersectionPointClosestPointConstructor2D(double tolerance)
    : m_tolerance(tolerance)
{
}

int RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(const RKMMathPoint2D &a,
                                                                           const RKMMathPoint2D &b,
                                                                           const RKMMathPoint2D &c,
                                                                           const RKMMathPoint2D &d, double &sqDistance)
{
  return ClosestExtremity(a, b, c, d, false, sqDistance);
}

HRESULT RKMPolyIntersectionPointClosestPointConstructor2D::Compute(const RKMMathPoint2D &a, const RKMMathPoint2D &b,
                                                                   const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                                                                   RKMMathPoint2D &out) const
{
  double d2;
  const int which = ClosestExtremity(a, b, c, d, true, d2);
  if (!(d2 <= m_tolerance * m_tolerance))
    return E_FAIL;
  out = Extremity(which, a, b, c, d);
  return S_OK;
}
