#include "RKMPolyTriangleSegmentIntersector.h"

#include <new>
#include <utility>

#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactDirection.h"
#include "RKMPolyExactPredicates.h"
#include "RKMPolyTriangleSegmentIntersector2D.h"

RKMPolyTriangleSegmentIntersector::RKMPolyTriangleSegmentIntersector(const RKMPolyExactArithmetic &arithmetic)
    : RKMPolyTriangleSegmentIntersector(&arithmetic)
{
}

RKMPolyTriangleSegmentIntersector::RKMPolyTriangleSegmentIntersector(const RKMPolyExactArithmetic *arithmetic)
    : m_arithmetic(arithmetic),
      m_intersector2D(arithmetic ? new (std::nothrow) RKMPolyTriangleSegmentIntersector2D(*arithmetic) : nullptr)
{
}

RKMPolyTriangleSegmentIntersector::RKMPolyTriangleSegmentIntersector(const RKMPolyTriangleSegmentIntersector &other)
    : m_arithmetic(other.m_arithmetic),
      m_intersector2D(other.m_intersector2D
                          ? new (std::nothrow) RKMPolyTriangleSegmentIntersector2D(*other.m_intersector2D)
                          : nullptr),
      m_count(other.m_count), m_planarAnswer(other.m_planarAnswer && m_intersector2D), m_point(other.m_point)
{
}

RKMPolyTriangleSegmentIntersector &
RKMPolyTriangleSegmentIntersector::operator=(const RKMPolyTriangleSegmentIntersector &other)
{
  if (this != &other)
  {
    RKMPolyTriangleSegmentIntersector copy(other);
    std::swap(m_arithmetic, copy.m_arithmetic);
    std::swap(m_intersector2D, copy.m_intersector2D);
    m_count = copy.m_count;
    m_planarAnswer = copy.m_planarAnswer;
    m_point = copy.m_point;
  }
  return *this;
}

RKMPolyTriangleSegmentIntersector::~RKMPolyTriangleSegmentIntersector()
{
  delete m_intersector2D;
}

const RKMPolyIntersectionPoint *RKMPolyTriangleSegmentIntersector::GetIntersectionPoints(int &n) const
{
  if (m_count == -1 && m_planarAnswer)
    return m_intersector2D->GetIntersectionPoints(n);
  if (m_count >= 1)
  {
    n = 1;
    return &m_point;
  }
  n = 0;
  return nullptr;
}

int RKMPolyTriangleSegmentIntersector::Intersect(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c,
                                                 const RKMMathPoint &p, const RKMMathPoint &q)
{
  m_count = 0;
  m_planarAnswer = false;
  m_point = RKMPolyIntersectionPoint();
  if (!m_arithmetic)
    return RKMPolyIntersection::ResultUndetermined;
  const RKMPolyExactArithmetic &ar = *m_arithmetic;
  const int sp = ar.Orientation3D(a, b, c, p), sq = ar.Orientation3D(a, b, c, q);
  if (sp * sq > 0)
    return RKMPolyIntersection::ResultDisjoint;
  if (sp == 0 && sq == 0)
  {
    m_count = -1;
    if (!m_intersector2D)
      return RKMPolyIntersection::ResultUndetermined;
    // A degenerate triangle has no plane to project along; the projection would be undefined.
    const int code = RKMPolyExactTriangleDirection(ar, a, b, c);
    if (code == 0)
      return RKMPolyIntersection::ResultDegenerateTriangle;
    m_planarAnswer = true;
    RKMMathPoint2D a2, b2, c2, p2, q2;
    RKMPolyProjectOntoCartesianPlane(code, a, a2);
    RKMPolyProjectOntoCartesianPlane(code, b, b2);
    RKMPolyProjectOntoCartesianPlane(code, c, c2);
    RKMPolyProjectOntoCartesianPlane(code, p, p2);
    RKMPolyProjectOntoCartesianPlane(code, q, q2);
    return m_intersector2D->Intersect(a2, b2, c2, p2, q2);
  }
  const RKMMathPoint &low = sq >= sp ? p : q, &high = sq >= sp ? q : p;
  const int e1 = ar.Orientation3D(a, b, low, high);
  const int e2 = ar.Orientation3D(b, c, low, high);
  const int e3 = ar.Orientation3D(c, a, low, high);
  if (e1 < 0 || e2 < 0 || e3 < 0)
    return RKMPolyIntersection::ResultDisjoint;
  const int zeros = (e1 == 0) + (e2 == 0) + (e3 == 0);
  if (zeros == 0)
    m_point.SetTriangleIntersection(0);
  else if (zeros == 1)
    m_point.SetBarIntersection(0, e1 == 0 ? 0 : (e2 == 0 ? 1 : 2));
  else if (e1 == 0 && e2 == 0)
    m_point.SetVertexIntersection(0, 1);
  else if (e2 == 0 && e3 == 0)
    m_point.SetVertexIntersection(0, 2);
  else if (e3 == 0 && e1 == 0)
    m_point.SetVertexIntersection(0, 0);
  else
    return RKMPolyIntersection::ResultDegenerateTriangle;
  if (sp == 0)
    m_point.SetVertexIntersection(1, 0);
  else if (sq == 0)
    m_point.SetVertexIntersection(1, 1);
  else
    m_point.SetBarIntersection(1, 0);
  m_count = 1;
  return RKMPolyIntersection::ResultOnePoint;
}
