#include "RKMPolyPointSegmentIntersector2D.h"

#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolySegmentAxis2D.h"

using RKMPolySegmentAxis2D::Coord;
using RKMPolySegmentAxis2D::MainAxis;
using RKMPolySegmentAxis2D::StrictlyInside;

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
