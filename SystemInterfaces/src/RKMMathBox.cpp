#include "RKMMathBox.h"

#include "RKMMathConstants.h"

#include <cmath>

namespace
{
// A NaN limit is read as unbounded on its side, so no geometry is dropped by a failed comparison.
inline double LowOf(double v) { return std::isnan(v) ? -HUGE_VAL : v; }
inline double HighOf(double v) { return std::isnan(v) ? HUGE_VAL : v; }
}

RKMMathBox::RKMMathBox() { SetToEmpty(); }

RKMMathBox::RKMMathBox(double xmin, double xmax, double ymin, double ymax, double zmin, double zmax)
{
  SetExtremities(xmin, xmax, ymin, ymax, zmin, zmax);
}

RKMMathBox::RKMMathBox(const RKMMathPoint &a, const RKMMathPoint &b)
{
  SetToEmpty();
  AddInside(a);
  AddInside(b);
}

unsigned char RKMMathBox::IsEmpty() const
{
  return m_min[0] > m_max[0] || m_min[1] > m_max[1] || m_min[2] > m_max[2];
}

void RKMMathBox::SetToEmpty()
{
  for (int i = 0; i < 3; ++i)
  {
    m_min[i] = RKMdoubleMax;
    m_max[i] = -RKMdoubleMax;
  }
}

HRESULT RKMMathBox::GetLimits(double &xmin, double &xmax, double &ymin, double &ymax, double &zmin,
                              double &zmax) const
{
  if (IsEmpty())
    return E_FAIL;
  GetExtremities(xmin, xmax, ymin, ymax, zmin, zmax);
  return S_OK;
}

void RKMMathBox::GetExtremities(double &xmin, double &xmax, double &ymin, double &ymax, double &zmin,
                                double &zmax) const
{
  xmin = m_min[0]; xmax = m_max[0];
  ymin = m_min[1]; ymax = m_max[1];
  zmin = m_min[2]; zmax = m_max[2];
}

void RKMMathBox::SetExtremities(double xmin, double xmax, double ymin, double ymax, double zmin, double zmax)
{
  m_min[0] = LowOf(xmin); m_max[0] = HighOf(xmax);
  m_min[1] = LowOf(ymin); m_max[1] = HighOf(ymax);
  m_min[2] = LowOf(zmin); m_max[2] = HighOf(zmax);
}

void RKMMathBox::AddInside(const RKMMathPoint &p)
{
  // A box emptied by inverted limits keeps them; growing starts again from nothing.
  if (IsEmpty())
    SetToEmpty();
  for (int i = 0; i < 3; ++i)
  {
    double v = p[i];
    if (std::isnan(v))
    {
      m_min[i] = -HUGE_VAL;
      m_max[i] = HUGE_VAL;
      continue;
    }
    if (v < m_min[i]) m_min[i] = v;
    if (v > m_max[i]) m_max[i] = v;
  }
}

void RKMMathBox::AddInside(const RKMMathBox &b)
{
  if (b.IsEmpty())
    return;
  if (IsEmpty())
    SetToEmpty();
  for (int i = 0; i < 3; ++i)
  {
    if (b.m_min[i] < m_min[i]) m_min[i] = b.m_min[i];
    if (b.m_max[i] > m_max[i]) m_max[i] = b.m_max[i];
  }
}

void RKMMathBox::Inflate(double d)
{
  if (IsEmpty())
    return;
  for (int i = 0; i < 3; ++i)
  {
    m_min[i] = LowOf(m_min[i] - d);
    m_max[i] = HighOf(m_max[i] + d);
  }
}

unsigned char RKMMathBox::IsContaining(const RKMMathPoint &p, double tolerance) const
{
  if (IsEmpty())
    return 0;
  for (int i = 0; i < 3; ++i)
    if (!(p[i] >= m_min[i] - tolerance && p[i] <= m_max[i] + tolerance))
      return 0;
  return 1;
}

unsigned char RKMMathBox::IsIntersecting(const RKMMathBox &b, double tolerance) const
{
  if (IsEmpty() || b.IsEmpty())
    return 0;
  // Written as "not separated" so that a NaN tolerance cannot hide an overlap.
  for (int i = 0; i < 3; ++i)
    if (b.m_max[i] + tolerance < m_min[i] || m_max[i] + tolerance < b.m_min[i])
      return 0;
  return 1;
}

double RKMMathBox::SquareDistanceTo(const RKMMathPoint &p) const
{
  if (IsEmpty())
    return RKMdoubleMax;
  double s = 0.0;
  for (int i = 0; i < 3; ++i)
  {
    double d = 0.0;
    if (p[i] < m_min[i]) d = m_min[i] - p[i];
    else if (p[i] > m_max[i]) d = p[i] - m_max[i];
    s += d * d;
  }
  return s;
}

double RKMMathBox::DistanceTo(const RKMMathPoint &p) const
{
  if (IsEmpty())
    return RKMdoubleMax;
  return std::sqrt(SquareDistanceTo(p));
}

double RKMMathBox::SquareDistanceTo(const RKMMathBox &b) const
{
  if (IsEmpty() || b.IsEmpty())
    return RKMdoubleMax;
  double s = 0.0;
  for (int i = 0; i < 3; ++i)
  {
    double d = 0.0;
    if (b.m_max[i] < m_min[i]) d = m_min[i] - b.m_max[i];
    else if (m_max[i] < b.m_min[i]) d = b.m_min[i] - m_max[i];
    s += d * d;
  }
  return s;
}

double RKMMathBox::Volume() const
{
  if (IsEmpty())
    return 0.0;
  const double ex = m_max[0] - m_min[0], ey = m_max[1] - m_min[1], ez = m_max[2] - m_min[2];
  // A flat box has no volume, even when another extent is infinite (inf · 0 would give NaN).
  if (ex == 0.0 || ey == 0.0 || ez == 0.0)
    return 0.0;
  return ex * ey * ez;
}

bool RKMMathBox::operator==(const RKMMathBox &b) const
{
  if (IsEmpty() || b.IsEmpty())
    return IsEmpty() && b.IsEmpty();
  for (int i = 0; i < 3; ++i)
    if (m_min[i] != b.m_min[i] || m_max[i] != b.m_max[i])
      return false;
  return true;
}
