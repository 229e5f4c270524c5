#include "RKMMathBox2D.h"

#include "RKMMathConstants.h"

#include <cmath>

RKMMathBox2D::RKMMathBox2D() { SetToEmpty(); }

RKMMathBox2D::RKMMathBox2D(double xmin, double xmax, double ymin, double ymax)
{
  SetExtremities(xmin, xmax, ymin, ymax);
}

unsigned char RKMMathBox2D::IsEmpty() const { return m_min[0] > m_max[0] || m_min[1] > m_max[1]; }

void RKMMathBox2D::SetToEmpty()
{
  m_min[0] = m_min[1] = RKMdoubleMax;
  m_max[0] = m_max[1] = -RKMdoubleMax;
}

void RKMMathBox2D::AddInside(const RKMMathPoint2D &p)
{
  if (IsEmpty())
    SetToEmpty();
  const double v[2] = {p.x, p.y};
  for (int i = 0; i < 2; ++i)
  {
    if (std::isnan(v[i]))
    {
      m_min[i] = -HUGE_VAL;
      m_max[i] = HUGE_VAL;
      continue;
    }
    if (v[i] < m_min[i]) m_min[i] = v[i];
    if (v[i] > m_max[i]) m_max[i] = v[i];
  }
}

void RKMMathBox2D::AddInside(const RKMMathBox2D &b)
{
  if (b.IsEmpty())
    return;
  if (IsEmpty())
    SetToEmpty();
  for (int i = 0; i < 2; ++i)
  {
    if (b.m_min[i] < m_min[i]) m_min[i] = b.m_min[i];
    if (b.m_max[i] > m_max[i]) m_max[i] = b.m_max[i];
  }
}

HRESULT RKMMathBox2D::GetLimits(double &xmin, double &xmax, double &ymin, double &ymax) const
{
  if (IsEmpty())
    return E_FAIL;
  xmin = m_min[0]; xmax = m_max[0];
  ymin = m_min[1]; ymax = m_max[1];
  return S_OK;
}

void RKMMathBox2D::SetExtremities(double xmin, double xmax, double ymin, double ymax)
{
  m_min[0] = std::isnan(xmin) ? -HUGE_VAL : xmin;
  m_max[0] = std::isnan(xmax) ? HUGE_VAL : xmax;
  m_min[1] = std::isnan(ymin) ? -HUGE_VAL : ymin;
  m_max[1] = std::isnan(ymax) ? HUGE_VAL : ymax;
}

unsigned char RKMMathBox2D::IsContaining(const RKMMathPoint2D &p, double tolerance) const
{
  if (IsEmpty())
    return 0;
  return p.x >= m_min[0] - tolerance && p.x <= m_max[0] + tolerance &&
         p.y >= m_min[1] - tolerance && p.y <= m_max[1] + tolerance;
}

unsigned char RKMMathBox2D::IsIntersecting(const RKMMathBox2D &b, double tolerance) const
{
  if (IsEmpty() || b.IsEmpty())
    return 0;
  for (int i = 0; i < 2; ++i)
    if (b.m_max[i] + tolerance < m_min[i] || m_max[i] + tolerance < b.m_min[i])
      return 0;
  return 1;
}
