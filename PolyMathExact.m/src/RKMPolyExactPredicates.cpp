#include "RKMPolyExactPredicates.h"

#include <cmath>

#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMMathVector.h"
#include "RKMPolyExactArithmetic.h"

RKMPolyExactPredicates::RKMPolyExactPredicates(const RKMPolyExactArithmetic &arithmetic) : m_arithmetic(&arithmetic)
{
}

RKMPolyExactPredicates::~RKMPolyExactPredicates() = default;

unsigned char RKMPolyExactPredicates::AreColinear(const RKMMathPoint &a, const RKMMathPoint &b,
                                                  const RKMMathPoint &c) const
{
  // Three points are collinear exactly when their projections onto each coordinate plane are.
  static const int kKept[3][2] = {{1, 2}, {0, 2}, {0, 1}};
  for (const auto &k : kKept)
  {
    const RKMMathPoint2D a2(a[k[0]], a[k[1]]), b2(b[k[0]], b[k[1]]), c2(c[k[0]], c[k[1]]);
    if (m_arithmetic->Orientation2D(a2, b2, c2) != 0)
      return 0;
  }
  return 1;
}

int RKMPolyIsInsidePolygon(const RKMMathPoint2D *vertices, int count, const RKMMathPoint2D &p,
                           const RKMPolyExactArithmetic &arithmetic, int *edge)
{
  if (count < 1 || !vertices)
    return -1;
  int result = -1;
  // The half-open crossing rule never sees a vertex that is a strict peak in y, so a point sitting
  // exactly on one is remembered and reported as on the boundary if no edge claims it.
  int onVertex = -1;
  for (int i = 0; i < count; ++i)
  {
    const int j = i == 0 ? count - 1 : i - 1;
    const RKMMathPoint2D &prev = vertices[j];
    const RKMMathPoint2D &cur = vertices[i];
    bool onBoundary = false;
    if (cur.y <= p.y && p.y < prev.y)
    {
      const int o = arithmetic.Orientation2D(cur, prev, p);
      onBoundary = o == 0;
      if (o > 0)
        result = -result;
    }
    else if (prev.y <= p.y && p.y < cur.y)
    {
      const int o = arithmetic.Orientation2D(prev, cur, p);
      onBoundary = o == 0;
      if (o > 0)
        result = -result;
    }
    else if (cur.y == p.y && prev.y == p.y && ((cur.x <= p.x && p.x <= prev.x) || (prev.x < p.x && p.x < cur.x)))
      onBoundary = true;
    if (onBoundary)
    {
      if (edge)
        *edge = j;
      return 0;
    }
    if (onVertex < 0 && cur.x == p.x && cur.y == p.y)
      onVertex = i;
  }
  if (onVertex >= 0)
  {
    if (edge)
      *edge = onVertex;
    return 0;
  }
  return result;
}

namespace
{
// 1 for x, 2 for y, 3 for z, signed by the component; x wins ties with y, z must be strictly larger;
// 0 when x is chosen and is not positive in magnitude (a null or NaN vector).
int MainAxis(double x, double y, double z)
{
  const double ax = std::fabs(x), ay = std::fabs(y), az = std::fabs(z);
  int axis = 1;
  double m = ax, v = x;
  if (ay > ax)
  {
    axis = 2;
    m = ay;
    v = y;
  }
  if (az > m)
  {
    axis = 3;
    v = z;
  }
  if (axis == 1 && !(ax > 0.0))
    return 0;
  return v < 0.0 ? -axis : axis;
}
} // namespace

int RKMPolyGetMainAxisDirection(const RKMMathVector &v)
{
  return MainAxis(v.x, v.y, v.z);
}

int RKMPolyGetMainTriangleDirection(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c)
{
  return RKMPolyGetMainAxisDirection((b - a) ^ (c - a));
}

HRESULT RKMPolyProjectOntoCartesianPlane(int code, const RKMMathPoint &p, RKMMathPoint2D &q)
{
  switch (code)
  {
  case 1:
    q = RKMMathPoint2D(p.y, p.z);
    return S_OK;
  case -1:
    q = RKMMathPoint2D(p.z, p.y);
    return S_OK;
  case 2:
    q = RKMMathPoint2D(p.z, p.x);
    return S_OK;
  case -2:
    q = RKMMathPoint2D(p.x, p.z);
    return S_OK;
  case 3:
    q = RKMMathPoint2D(p.x, p.y);
    return S_OK;
  case -3:
    q = RKMMathPoint2D(p.y, p.x);
    return S_OK;
  default:
    return S_FALSE;
  }
}

int RKMPolyGetMainSegmentDirection(const RKMMathPoint2D &a, const RKMMathPoint2D &b)
{
  const double dx = b.x - a.x, dy = b.y - a.y;
  if (std::fabs(dy) > std::fabs(dx))
    return dy > 0.0 ? 2 : -2;
  if (dx > 0.0)
    return 1;
  if (dx < 0.0)
    return -1;
  return 0;
}

double RKMPolyProjectOnAxis(const RKMMathPoint2D &p, int code)
{
  switch (code)
  {
  case -2:
    return -p.y;
  case -1:
    return -p.x;
  case 1:
    return p.x;
  case 2:
    return p.y;
  default:
    return 0.0;
  }
}
