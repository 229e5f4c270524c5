#include "RKMMathLine.h"

#include <cmath>

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
