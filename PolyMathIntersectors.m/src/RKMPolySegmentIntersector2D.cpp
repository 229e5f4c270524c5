#include "RKMPolySegmentIntersector2D.h"

#include <cmath>

#include "RKMMathBox2D.h"
#include "RKMMathConstants.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyIntersectionPointClosestPointConstructor2D.h"
#include "RKMPolyIntersectionPointDefaultConstructor2D.h"
#include "RKMPolyPointSegmentIntersector2D.h"

namespace
{
// The axis (0 for x, 1 for y) along which b − a is larger; x on ties.
int MainAxis(const RKMMathPoint2D &a, const RKMMathPoint2D &b)
{
  return std::fabs(b.y - a.y) > std::fabs(b.x - a.x) ? 1 : 0;
}

double Coord(const RKMMathPoint2D &p, int axis)
{
  return axis ? p.y : p.x;
}

// v strictly between the coordinates of a and b along the axis.
bool StrictlyInside(double v, double a, double b)
{
  return a < b ? (a < v && v < b) : (b < v && v < a);
}

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

RKMPolyIntersectionPointConstructor2D::~RKMPolyIntersectionPointConstructor2D() = default;

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

RKMPolySegmentIntersector2D::RKMPolySegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic)
    : m_arithmetic(&arithmetic)
{
}

RKMPolySegmentIntersector2D::RKMPolySegmentIntersector2D(const RKMPolyExactArithmetic *arithmetic)
    : m_arithmetic(arithmetic)
{
}

RKMPolySegmentIntersector2D::RKMPolySegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic,
                                                         const RKMPolyIntersectionPointConstructor2D &constructor)
    : m_arithmetic(&arithmetic), m_constructor(&constructor)
{
}

void RKMPolySegmentIntersector2D::SetFeature(int i, int type, int vertex)
{
  m_type[i] = type;
  m_vertex[i] = vertex;
}

int RKMPolySegmentIntersector2D::Join(const RKMMathPoint2D &p, const RKMMathPoint2D &s, const RKMMathPoint2D &q,
                                      int i0, int i1)
{
  int r;
  if (m_arithmetic->Orientation2D(p, s, q) != 0)
    r = 1;
  else
  {
    m_colinear = 1;
    const int axis = MainAxis(p, s);
    const double ps = Coord(p, axis), ss = Coord(s, axis), qs = Coord(q, axis);
    r = (ps < ss && ss < qs) || (qs < ss && ss < ps) ? 1 : 2;
  }
  if (r == 1)
  {
    SetFeature(0, 1, i0);
    SetFeature(1, 1, i1);
  }
  return r;
}

int RKMPolySegmentIntersector2D::Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                           const RKMMathPoint2D &d)
{
  m_result = -1;
  m_colinear = 0;
  SetFeature(0, 0, 0);
  SetFeature(1, 0, 0);
  if (!m_arithmetic)
    return m_result;
  if (a == b || c == d)
    return m_result = -5;
  if ((a == c && b == d) || (a == d && b == c))
  {
    m_colinear = 1;
    return m_result = 2;
  }
  if (a == c)
    return m_result = Join(b, a, d, 0, 0);
  if (a == d)
    return m_result = Join(b, a, c, 0, 1);
  if (b == c)
    return m_result = Join(a, b, d, 1, 0);
  if (b == d)
    return m_result = Join(a, b, c, 1, 1);

  const int o1 = m_arithmetic->Orientation2D(c, d, a);
  const int o2 = m_arithmetic->Orientation2D(c, d, b);
  if (o1 == 0 && o2 == 0)
  {
    m_colinear = 1;
    const int axis = MainAxis(a, b);
    double a0 = Coord(a, axis), a1 = Coord(b, axis), c0 = Coord(c, axis), c1 = Coord(d, axis);
    if (a0 > a1)
      std::swap(a0, a1);
    if (c0 > c1)
      std::swap(c0, c1);
    return m_result = (c0 < a1 && a0 < c1) ? 2 : 0;
  }
  if (o1 + o2 == 2 || o1 + o2 == -2)
    return m_result = 0;
  const int o3 = m_arithmetic->Orientation2D(a, b, c);
  const int o4 = m_arithmetic->Orientation2D(a, b, d);
  if (o3 + o4 == 2 || o3 + o4 == -2)
    return m_result = 0;
  if (o1 != 0 && o2 != 0 && o3 != 0 && o4 != 0)
  {
    SetFeature(0, 2, 0);
    SetFeature(1, 2, 0);
  }
  else if (o1 != 0 && o2 != 0)
  {
    SetFeature(0, 2, 0);
    SetFeature(1, 1, o3 == 0 ? 0 : 1);
  }
  else
  {
    SetFeature(0, 1, o1 == 0 ? 0 : 1);
    SetFeature(1, 2, 0);
  }
  return m_result = 1;
}

int RKMPolySegmentIntersector2D::Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                           const RKMMathPoint2D &d, RKMPolyIntersection::Type &type,
                                           RKMPolyIntersection::Error &error)
{
  const int r = Intersect(a, b, c, d);
  switch (r)
  {
  case 0:
    type = RKMPolyIntersection::TypeNone;
    error = RKMPolyIntersection::ErrorNone;
    break;
  case 1:
    type = RKMPolyIntersection::TypePoint;
    error = RKMPolyIntersection::ErrorNone;
    break;
  case 2:
    type = RKMPolyIntersection::TypeOverlap;
    error = RKMPolyIntersection::ErrorColinear;
    break;
  case -5:
    type = RKMPolyIntersection::TypeUndefined;
    error = RKMPolyIntersection::ErrorDegenerate;
    break;
  case -3:
    type = RKMPolyIntersection::TypeUndefined;
    error = RKMPolyIntersection::ErrorColinear;
    break;
  default:
    type = RKMPolyIntersection::TypeUndefined;
    error = RKMPolyIntersection::ErrorUndetermined;
    break;
  }
  return r;
}

HRESULT RKMPolySegmentIntersector2D::ConstructIntersection(const RKMMathPoint2D &a, const RKMMathPoint2D &b,
                                                           const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                                                           RKMMathPoint2D &out) const
{
  if (m_result != 1)
    return E_FAIL;
  if (m_type[0] == 1)
  {
    out = m_vertex[0] ? b : a;
    return S_OK;
  }
  if (m_type[1] == 1)
  {
    out = m_vertex[1] ? d : c;
    return S_OK;
  }
  const bool gridded = m_arithmetic->GetMode() == RKMPolyExactArithmetic::Gridded;
  HRESULT hr;
  if (m_constructor)
    hr = m_constructor->Compute(a, b, c, d, out);
  else
    hr = RKMPolyIntersectionPointDefaultConstructor2D(gridded ? 3.0 * m_arithmetic->GetCoordinatePrecision() : 0.0)
             .Compute(a, b, c, d, out);
  if (gridded && SUCCEEDED(hr))
    m_arithmetic->Normalize(out);
  return hr;
}

HRESULT RKMPolySegmentIntersector2D::GetClosestExtremity(const RKMMathPoint2D &a, const RKMMathPoint2D &b,
                                                         const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                                                         int &which) const
{
  which = 0;
  if (m_result == 1)
  {
    double d2;
    which = RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(a, b, c, d, d2);
    return S_OK;
  }
  if (m_result != 2)
    return E_FAIL;
  const int axis = MainAxis(a, b);
  const double av = Coord(a, axis), bv = Coord(b, axis), cv = Coord(c, axis), dv = Coord(d, axis);
  if (StrictlyInside(cv, av, bv))
    which = 3;
  else if (StrictlyInside(dv, av, bv))
    which = 4;
  else if (StrictlyInside(av, cv, dv))
    which = 1;
  else if (StrictlyInside(bv, cv, dv))
    which = 2;
  return S_OK;
}

RKMPolyPointSegmentIntersector2D::RKMPolyPointSegmentIntersector2D(const RKMPolyExactArithmetic &arithmetic)
    : m_arithmetic(&arithmetic)
{
}

HRESULT RKMPolyPointSegmentIntersector2D::Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b,
                                                    const RKMMathPoint2D &p, RKMPolyIntersection::Type &type,
                                                    RKMPolyIntersection::Error &error, int *where) const
{
  error = RKMPolyIntersection::ErrorNone;
  auto answer = [&](RKMPolyIntersection::Type t, int w, HRESULT hr) {
    type = t;
    if (where)
      *where = w;
    return hr;
  };
  if (m_arithmetic->Orientation2D(a, b, p) != 0)
    return answer(RKMPolyIntersection::TypeNone, 0, S_FALSE);
  if (a == b)
  {
    error = RKMPolyIntersection::ErrorDegenerate;
    if (p == a)
      return answer(RKMPolyIntersection::TypePoint, 2, S_OK);
    return S_FALSE;
  }
  if (p == a)
    return answer(RKMPolyIntersection::TypePoint, 1, S_OK);
  if (p == b)
    return answer(RKMPolyIntersection::TypePoint, 3, S_OK);
  const int axis = MainAxis(a, b);
  if (StrictlyInside(Coord(p, axis), Coord(a, axis), Coord(b, axis)))
    return answer(RKMPolyIntersection::TypePoint, 2, S_OK);
  return answer(RKMPolyIntersection::TypeNone, 0, S_FALSE);
}
