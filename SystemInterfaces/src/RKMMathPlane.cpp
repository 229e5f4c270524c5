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
