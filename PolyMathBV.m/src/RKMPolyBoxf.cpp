#include "RKMPolyBoxf.h"

#include "RKMMathBox.h"
#include "RKMMathFloat.h"
#include "RKMMathPoint.h"
#include "RKMMathPointf.h"

#include <cfloat>
#include <cmath>
#include <cstdint>
#include <cstring>

namespace
{
constexpr float kInf = HUGE_VALF;

inline std::uint32_t Bits(float f)
{
  std::uint32_t i;
  std::memcpy(&i, &f, sizeof i);
  return i;
}

inline float FromBits(std::uint32_t i)
{
  float f;
  std::memcpy(&f, &i, sizeof f);
  return f;
}

// The next float toward −∞, by one step of the bit pattern read as a signed integer. An infinite
// bound stays infinite: the raw integer step would turn −∞ into a NaN. The arithmetic is done
// unsigned, where +1 on 0x7FFFFFFF is defined.
inline float StepDown(float f)
{
  const std::uint32_t i = Bits(f);
  if (static_cast<std::int32_t>(i) >= 1)
    return FromBits(i - 1u);
  if (f == 0.0f)
    return FromBits(0x80000001u);
  if (f == -kInf)
    return f;
  return FromBits(i + 1u);
}

// The next float toward +∞; +∞ stays +∞ and the largest finite float becomes +∞.
inline float StepUp(float f)
{
  const std::uint32_t i = Bits(f);
  if (static_cast<std::int32_t>(i) >= 1)
    return f == kInf ? f : FromBits(i + 1u);
  if (f == 0.0f)
    return FromBits(0x00000001u);
  return FromBits(i - 1u);
}

// A double entering as a lower or upper bound: rounded, then stepped outward, so the float bound lies
// on the safe side of the double. A NaN gives an unbounded side.
inline float LowerBound(double d) { return std::isnan(d) ? -kInf : StepDown(RKMRoundToFloat(d)); }
inline float UpperBound(double d) { return std::isnan(d) ? kInf : StepUp(RKMRoundToFloat(d)); }

inline float LowerFloat(float f) { return std::isnan(f) ? -kInf : f; }
inline float UpperFloat(float f) { return std::isnan(f) ? kInf : f; }
}

RKMPolyBoxf::RKMPolyBoxf(const RKMPolyBoxf &other)
{
  if (other.IsEmpty())
  {
    SetToEmpty();
    return;
  }
  for (int i = 0; i < 3; ++i)
  {
    m_min[i] = other.m_min[i];
    m_max[i] = other.m_max[i];
  }
}

RKMPolyBoxf::RKMPolyBoxf(float xmin, float xmax, float ymin, float ymax, float zmin, float zmax)
{
  SetExtremities(xmin, xmax, ymin, ymax, zmin, zmax);
}

RKMPolyBoxf::RKMPolyBoxf(double xmin, double xmax, double ymin, double ymax, double zmin, double zmax)
{
  m_min[0] = LowerBound(xmin); m_max[0] = UpperBound(xmax);
  m_min[1] = LowerBound(ymin); m_max[1] = UpperBound(ymax);
  m_min[2] = LowerBound(zmin); m_max[2] = UpperBound(zmax);
}

RKMPolyBoxf::RKMPolyBoxf(const RKMMathBox &box) { SetBox(box); }

void RKMPolyBoxf::SetToEmpty()
{
  m_min[0] = m_min[1] = m_min[2] = 1.0f;
  m_max[0] = m_max[1] = m_max[2] = -1.0f;
}

void RKMPolyBoxf::SetExtremities(float xmin, float xmax, float ymin, float ymax, float zmin, float zmax)
{
  m_min[0] = LowerFloat(xmin); m_max[0] = UpperFloat(xmax);
  m_min[1] = LowerFloat(ymin); m_max[1] = UpperFloat(ymax);
  m_min[2] = LowerFloat(zmin); m_max[2] = UpperFloat(zmax);
}

void RKMPolyBoxf::SetBox(const RKMMathBox &box)
{
  SetToEmpty();
  double l[6];
  if (FAILED(box.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5])))
    return;
  *this = RKMPolyBoxf(l[0], l[1], l[2], l[3], l[4], l[5]);
}

void RKMPolyBoxf::AddInside(const RKMPolyBoxf &other)
{
  if (other.IsEmpty())
    return;
  if (IsEmpty())
  {
    *this = other;
    return;
  }
  for (int i = 0; i < 3; ++i)
  {
    if (other.m_min[i] < m_min[i]) m_min[i] = other.m_min[i];
    if (other.m_max[i] > m_max[i]) m_max[i] = other.m_max[i];
  }
}

void RKMPolyBoxf::AddInside(const RKMMathBox &box)
{
  double l[6];
  if (FAILED(box.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5])))
    return;
  if (IsEmpty())
  {
    SetBox(box);
    return;
  }
  for (int i = 0; i < 3; ++i)
  {
    const double lo = l[2 * i], hi = l[2 * i + 1];
    if (lo < m_min[i]) m_min[i] = LowerBound(lo);
    if (hi > m_max[i]) m_max[i] = UpperBound(hi);
  }
}

void RKMPolyBoxf::AddInside(const RKMMathPoint &p)
{
  const bool wasEmpty = IsEmpty();
  for (int i = 0; i < 3; ++i)
  {
    const double c = p[i];
    if (std::isnan(c))
    {
      m_min[i] = -kInf;
      m_max[i] = kInf;
    }
    else if (wasEmpty)
    {
      m_min[i] = LowerBound(c);
      m_max[i] = UpperBound(c);
    }
    else if (c < m_min[i])
      m_min[i] = LowerBound(c);
    else if (c > m_max[i])
      m_max[i] = UpperBound(c);
  }
}

void RKMPolyBoxf::AddInside(const RKMMathPointf &p)
{
  const float c[3] = {p.x, p.y, p.z};
  const bool wasEmpty = IsEmpty();
  for (int i = 0; i < 3; ++i)
  {
    if (std::isnan(c[i]))
    {
      m_min[i] = -kInf;
      m_max[i] = kInf;
    }
    else if (wasEmpty)
      m_min[i] = m_max[i] = c[i];
    else if (c[i] < m_min[i])
      m_min[i] = c[i];
    else if (c[i] > m_max[i])
      m_max[i] = c[i];
  }
}

void RKMPolyBoxf::SetToUnion(const RKMPolyBoxf &a, const RKMPolyBoxf &b)
{
  if (a.IsEmpty())
  {
    *this = b;
    return;
  }
  if (b.IsEmpty())
  {
    *this = a;
    return;
  }
  for (int i = 0; i < 3; ++i)
  {
    const float lo = b.m_min[i] < a.m_min[i] ? b.m_min[i] : a.m_min[i];
    const float hi = b.m_max[i] > a.m_max[i] ? b.m_max[i] : a.m_max[i];
    m_min[i] = lo;
    m_max[i] = hi;
  }
}

void RKMPolyBoxf::Inflate(double d)
{
  if (IsEmpty())
    return;
  // The moved bounds are formed in double and then rounded and stepped like any double entering the
  // box. Rounding d to float first would lose up to half an ulp of d, which one step of a small result
  // does not cover when a bound and d nearly cancel. inf − inf gives a NaN: an unbounded side.
  for (int i = 0; i < 3; ++i)
  {
    m_min[i] = LowerBound(static_cast<double>(m_min[i]) - d);
    m_max[i] = UpperBound(static_cast<double>(m_max[i]) + d);
  }
}

HRESULT RKMPolyBoxf::GetLimits(float &xmin, float &xmax, float &ymin, float &ymax, float &zmin,
                               float &zmax) const
{
  if (IsEmpty())
    return E_FAIL;
  xmin = m_min[0]; xmax = m_max[0];
  ymin = m_min[1]; ymax = m_max[1];
  zmin = m_min[2]; zmax = m_max[2];
  return S_OK;
}

HRESULT RKMPolyBoxf::GetLimits(double &xmin, double &xmax, double &ymin, double &ymax, double &zmin,
                               double &zmax) const
{
  float f[6];
  const HRESULT hr = GetLimits(f[0], f[1], f[2], f[3], f[4], f[5]);
  if (SUCCEEDED(hr))
  {
    xmin = f[0]; xmax = f[1];
    ymin = f[2]; ymax = f[3];
    zmin = f[4]; zmax = f[5];
  }
  return hr;
}

HRESULT RKMPolyBoxf::GetLowLimit(RKMMathPoint &p) const
{
  if (IsEmpty())
    return E_FAIL;
  p = RKMMathPoint(m_min[0], m_min[1], m_min[2]);
  return S_OK;
}

HRESULT RKMPolyBoxf::GetHighLimit(RKMMathPoint &p) const
{
  if (IsEmpty())
    return E_FAIL;
  p = RKMMathPoint(m_max[0], m_max[1], m_max[2]);
  return S_OK;
}

RKMMathBox RKMPolyBoxf::GetMathBox() const
{
  if (IsEmpty())
    return RKMMathBox();
  return RKMMathBox(m_min[0], m_max[0], m_min[1], m_max[1], m_min[2], m_max[2]);
}

double RKMPolyBoxf::Volume() const
{
  if (IsEmpty())
    return 0.0;
  return (static_cast<double>(m_max[0]) - m_min[0]) * (static_cast<double>(m_max[1]) - m_min[1]) *
         (static_cast<double>(m_max[2]) - m_min[2]);
}

unsigned char RKMPolyBoxf::IsContaining(const RKMMathPoint &p) const
{
  if (IsEmpty())
    return 0;
  for (int i = 0; i < 3; ++i)
    if (!(static_cast<double>(m_min[i]) <= p[i] && p[i] <= static_cast<double>(m_max[i])))
      return 0;
  return 1;
}

unsigned char RKMPolyBoxf::IsIntersecting(const RKMPolyBoxf &other, float tolerance) const
{
  if (IsEmpty() || other.IsEmpty())
    return 0;
  // "Not separated" rather than "overlapping": a NaN tolerance cannot make the test miss.
  for (int i = 0; i < 3; ++i)
    if (other.m_max[i] + tolerance < m_min[i] || m_max[i] + tolerance < other.m_min[i])
      return 0;
  return 1;
}

unsigned char RKMPolyBoxf::IsIntersecting(const RKMMathBox &box, double tolerance) const
{
  double l[6];
  if (IsEmpty() || FAILED(box.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5])))
    return 0;
  // Rounding to nearest is monotone, so the rounded limits are never on the wrong side of a float
  // bound that the double limits reach: no overlap is lost by not stepping here.
  for (int i = 0; i < 3; ++i)
    if (RKMRoundToFloat(l[2 * i + 1] + tolerance) < m_min[i] || m_max[i] < RKMRoundToFloat(l[2 * i] - tolerance))
      return 0;
  return 1;
}

RKMPolyBoxf::IntersectionTestOrder RKMPolyBoxf::GetAxisTestOrder() const
{
  const double ex = static_cast<double>(m_max[0]) - m_min[0];
  const double ey = static_cast<double>(m_max[1]) - m_min[1];
  const double ez = static_cast<double>(m_max[2]) - m_min[2];
  if (ey >= ex)
  {
    if (ez >= ey) return OrderXYZ;
    if (ez >= ex) return OrderXZY;
    return OrderZXY;
  }
  if (ez >= ex) return OrderYXZ;
  if (ez >= ey) return OrderYZX;
  return OrderZYX;
}
