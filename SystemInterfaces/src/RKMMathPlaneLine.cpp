#include "RKMMathLine.h"
#include "RKMMathPlane.h"

#include <cmath>

RKMMathPlane::RKMMathPlane() : m_origin(0, 0, 0), m_u(1, 0, 0), m_v(0, 1, 0) {}

RKMMathPlane::RKMMathPlane(const RKMMathPoint &origin, const RKMMathVector &u, const RKMMathVector &v)
    : m_origin(origin), m_u(u), m_v(v)
{
}

void RKMMathPlane::GetDirections(RKMMathVector &u, RKMMathVector &v) const
{
  u = m_u;
  v = m_v;
}

void RKMMathPlane::SetDirections(const RKMMathVector &u, const RKMMathVector &v)
{
  m_u = u;
  m_v = v;
}

RKMMathVector RKMMathPlane::GetNormal() const
{
  RKMMathVector n = m_u ^ m_v;
  return SUCCEEDED(n.Normalize()) ? n : RKMMathVector();
}

double RKMMathPlane::DistanceTo(const RKMMathPoint &p) const
{
  const RKMMathVector n = GetNormal();
  if (n == RKMMathVector())
    return p.DistanceTo(m_origin);
  return std::fabs((p - m_origin) * n);
}

RKMMathLine::RKMMathLine() : m_origin(0, 0, 0), m_direction(1, 0, 0) {}

RKMMathLine::RKMMathLine(const RKMMathPoint &origin, const RKMMathVector &direction)
    : m_origin(origin), m_direction(direction)
{
}

RKMMathPoint RKMMathLine::Project(const RKMMathPoint &p) const
{
  RKMMathVector u = m_direction;
  if (FAILED(u.Normalize()))
    return m_origin;
  return m_origin + u * ((p - m_origin) * u);
}

double RKMMathLine::SquareDistanceTo(const RKMMathPoint &p) const { return p.SquareDistanceTo(Project(p)); }

double RKMMathLine::DistanceTo(const RKMMathPoint &p) const { return p.DistanceTo(Project(p)); }
