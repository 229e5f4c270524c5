#include "RKMPolyGeodesicSegmentIntersector.h"

#include <cmath>

#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactDirection.h"
#include "RKMPolyExactPredicates.h"

namespace
{
// The axis on which a and b differ most: x on ties with y or z, then y.
int WidestAxis(const RKMMathPoint &a, const RKMMathPoint &b)
{
  const double dx = std::fabs(b.x - a.x), dy = std::fabs(b.y - a.y), dz = std::fabs(b.z - a.z);
  if (dx >= dy && dx >= dz)
    return 0;
  if (dy >= dx && dy >= dz)
    return 1;
  return 2;
}

// O strictly between a and b on the axis where they differ most.
bool Between(const RKMMathPoint &o, const RKMMathPoint &a, const RKMMathPoint &b)
{
  const int k = WidestAxis(a, b);
  return (a[k] < o[k] && o[k] < b[k]) || (b[k] < o[k] && o[k] < a[k]);
}
} // namespace

RKMPolyGeodesicSegmentIntersector::RKMPolyGeodesicSegmentIntersector(const RKMPolyExactArithmetic &arithmetic,
                                                                     const RKMMathPoint &apex)
    : RKMPolyTriangleIntersector(arithmetic), m_apex(&apex)
{
}

int RKMPolyGeodesicSegmentIntersector::Determinant(const RKMMathPoint &p, const RKMMathPoint &q,
                                                   const RKMMathPoint &r) const
{
  return GetPosition(*m_apex, p, q, r);
}

void RKMPolyGeodesicSegmentIntersector::ApplyFeatures(const RKMPolyIntersectionPoint &pt)
{
  // Segment i is bar 1 of its triangle O, end 0, end 1.
  for (int i = 0; i < 2; ++i)
  {
    const int type = pt.GetEntityType(i), index = pt.index[i];
    if (type == RKMPolyIntersectionPoint::Vertex)
    {
      if (index == 1 || index == 2)
      {
        m_type[i] = 1;
        m_vertex[i] = index - 1;
      }
    }
    else if (type == RKMPolyIntersectionPoint::Bar && index != 1)
    {
      m_type[i] = 1;
      m_vertex[i] = index == 0 ? 0 : 1;
    }
    else if (type == RKMPolyIntersectionPoint::Bar || type == RKMPolyIntersectionPoint::Triangle)
      m_type[i] = 2;
  }
}

int RKMPolyGeodesicSegmentIntersector::Intersect(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c,
                                                 const RKMMathPoint &d)
{
  m_result = RKMPolyIntersection::ResultUndetermined;
  m_type[0] = m_type[1] = 0;
  m_vertex[0] = m_vertex[1] = 0;
  m_colinear = 0;
  if (!m_arithmetic)
    return m_result;
  const int r = RKMPolyTriangleIntersector::Intersect(*m_apex, a, b, c, d);
  m_colinear = AreTrianglesCoplanar();
  switch (r)
  {
  case RKMPolyIntersection::ResultDegenerateTriangle:
  {
    const RKMPolyExactPredicates predicates(*m_arithmetic);
    if (predicates.AreColinear(*m_apex, a, b))
      m_result = Between(*m_apex, a, b) ? RKMPolyIntersection::ResultApexBetween
                                        : RKMPolyIntersection::ResultPointSegment;
    else if (predicates.AreColinear(*m_apex, c, d))
      m_result = Between(*m_apex, c, d) ? RKMPolyIntersection::ResultApexBetween
                                        : RKMPolyIntersection::ResultPointSegment;
    break;
  }
  case -4:
  case RKMPolyIntersection::ResultDisjoint:
    m_result = RKMPolyIntersection::ResultInadmissible;
    break;
  case RKMPolyIntersection::ResultOnePoint:
    m_result = RKMPolyIntersection::ResultDisjoint;
    break;
  case RKMPolyIntersection::ResultTwoPoints:
  {
    m_result = RKMPolyIntersection::ResultOnePoint;
    int n = 0;
    const RKMPolyIntersectionPoint *pts = GetIntersectionPoints(n);
    for (int k = 0; k < n && pts; ++k)
      ApplyFeatures(pts[k]);
    break;
  }
  case RKMPolyIntersection::ResultPolygon:
    m_result = RKMPolyIntersection::ResultTwoPoints;
    break;
  default:
    break;
  }
  return m_result;
}

unsigned char RKMPolyGeodesicSegmentIntersector::IsPointWithinSector(const RKMMathPoint &a, const RKMMathPoint &b,
                                                                     const RKMMathPoint &p) const
{
  if (!m_arithmetic)
    return 0;
  const RKMMathPoint &o = *m_apex;
  // A degenerate sector has no plane to project along.
  const int code = RKMPolyExactTriangleDirection(*m_arithmetic, o, a, b);
  if (code == 0)
    return 0;
  RKMMathPoint2D o2, a2, b2, p2;
  RKMPolyProjectOntoCartesianPlane(code, o, o2);
  RKMPolyProjectOntoCartesianPlane(code, a, a2);
  RKMPolyProjectOntoCartesianPlane(code, b, b2);
  RKMPolyProjectOntoCartesianPlane(code, p, p2);
  int s1 = m_arithmetic->Orientation2D(o2, p2, a2);
  int s2 = m_arithmetic->Orientation2D(o2, p2, b2);
  if (s1 == 0)
    s1 = Between(o, p, a) ? s2 : -s2;
  if (s2 == 0)
    s2 = Between(o, p, b) ? s1 : -s1;
  if (s1 * s2 > 0)
    return 0;
  return s2 > 0;
}
