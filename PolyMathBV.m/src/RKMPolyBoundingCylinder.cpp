#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBoundingCylinder.h"

#include <cmath>

HRESULT RKMPolyBoundingCylinder::Accept(RKMPolyBVConstVisitor &visitor) const
{
  return visitor.VisitConcrete(*this);
}

RKMPolyBoundingCylinder::RKMPolyBoundingCylinder(const RKMMathPoint &center, const RKMMathVector &direction,
                                                 double radius, double limit)
    : m_center(center), m_direction(direction), m_radius(radius), m_limit(limit)
{
  NormalizeDirection(m_direction);
}

void RKMPolyBoundingCylinder::Set(const RKMMathPoint &center, const RKMMathVector &direction, double radius,
                                  double limit)
{
  m_center = center;
  m_direction = direction;
  NormalizeDirection(m_direction);
  m_radius = radius;
  if (limit > 0.0)
    m_limit = limit;
}

void RKMPolyBoundingCylinder::NormalizeDirection(RKMMathVector &v)
{
  const double n2 = v.SquareNorm();
  if (n2 == 1.0)
    return;
  if (v.x == 0.0 && v.y == 0.0 && v.z == 0.0)
  {
    v = RKMMathVector(1.0, 0.0, 0.0);
    return;
  }
  // Where n² is a normal number, the plain rule; where it overflows or underflows (components beyond
  // about 1e154 or below 1e-154), the scaled norm, which keeps the direction.
  if (n2 > 1e-300 && n2 < 1e300)
  {
    const double k = 1.0 / std::sqrt(n2);
    v = RKMMathVector(v.x * k, v.y * k, v.z * k);
    return;
  }
  if (FAILED(v.Normalize()) && !(std::isnan(v.x) || std::isnan(v.y) || std::isnan(v.z)))
  {
    // Infinite components: the direction of the infinite ones.
    v = RKMMathVector(std::isinf(v.x) ? std::copysign(1.0, v.x) : 0.0, std::isinf(v.y) ? std::copysign(1.0, v.y) : 0.0,
                      std::isinf(v.z) ? std::copysign(1.0, v.z) : 0.0);
    v.Normalize();
  }
}
