#include "RKMPolySegmentIntersector2D.h"

#include <utility>

#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyIntersectionPointClosestPointConstructor2D.h"
#include "RKMPolyIntersectionPointDefaultConstructor2D.h"
#include "RKMPolySegmentAxis2D.h"

using RKMPolySegmentAxis2D::Coord;
using RKMPolySegmentAxis2D::MainAxis;
using RKMPolySegmentAxis2D::StrictlyInside;

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
    r = RKMPolyIntersection::ResultOnePoint;
  else
  {
    m_colinear = 1;
    const int axis = MainAxis(p, s);
    const double ps = Coord(p, axis), ss = Coord(s, axis), qs = Coord(q, axis);
    r = (ps < ss && ss < qs) || (qs < ss && ss < ps) ? RKMPolyIntersection::ResultOnePoint
                                                      : RKMPolyIntersection::ResultTwoPoints;
  }
  if (r == RKMPolyIntersection::ResultOnePoint)
  {
    SetFeature(0, 1, i0);
    SetFeature(1, 1, i1);
  }
  return r;
}

int RKMPolySegmentIntersector2D::Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                           const RKMMathPoint2D &d)
{
  m_result = RKMPolyIntersection::ResultUndetermined;
  m_colinear = 0;
  SetFeature(0, 0, 0);
  SetFeature(1, 0, 0);
  if (!m_arithmetic)
    return m_result;
  if (a == b || c == d)
    return m_result = RKMPolyIntersection::ResultPointSegment;
  if ((a == c && b == d) || (a == d && b == c))
  {
    m_colinear = 1;
    return m_result = RKMPolyIntersection::ResultTwoPoints;
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
    return m_result =
               (c0 < a1 && a0 < c1) ? RKMPolyIntersection::ResultTwoPoints : RKMPolyIntersection::ResultDisjoint;
  }
  if (o1 + o2 == 2 || o1 + o2 == -2)
    return m_result = RKMPolyIntersection::ResultDisjoint;
  const int o3 = m_arithmetic->Orientation2D(a, b, c);
  const int o4 = m_arithmetic->Orientation2D(a, b, d);
  if (o3 + o4 == 2 || o3 + o4 == -2)
    return m_result = RKMPolyIntersection::ResultDisjoint;
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
  return m_result = RKMPolyIntersection::ResultOnePoint;
}

int RKMPolySegmentIntersector2D::Intersect(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                           const RKMMathPoint2D &d, RKMPolyIntersection::Type &type,
                                           RKMPolyIntersection::Error &error)
{
  const int r = Intersect(a, b, c, d);
  switch (r)
  {
  case RKMPolyIntersection::ResultDisjoint:
    type = RKMPolyIntersection::TypeNone;
    error = RKMPolyIntersection::ErrorNone;
    break;
  case RKMPolyIntersection::ResultOnePoint:
    type = RKMPolyIntersection::TypePoint;
    error = RKMPolyIntersection::ErrorNone;
    break;
  case RKMPolyIntersection::ResultTwoPoints:
    type = RKMPolyIntersection::TypeOverlap;
    error = RKMPolyIntersection::ErrorColinear;
    break;
  case RKMPolyIntersection::ResultPointSegment:
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
  if (m_result != RKMPolyIntersection::ResultOnePoint)
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
  if (m_result == RKMPolyIntersection::ResultOnePoint)
  {
    double d2;
    which = RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(a, b, c, d, d2);
    return S_OK;
  }
  if (m_result != RKMPolyIntersection::ResultTwoPoints)
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
