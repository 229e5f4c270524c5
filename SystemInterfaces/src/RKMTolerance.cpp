#include "RKMTolerance.h"

#include <cmath>

RKMTolerance::RKMTolerance() : m_resolution(1e-3), m_smallLength(1e-6), m_numericalEpsilon(1e-12) {}

RKMTolerance::RKMTolerance(double resolution, double smallLength, double numericalEpsilon)
    : m_resolution(resolution), m_smallLength(smallLength), m_numericalEpsilon(numericalEpsilon)
{
}

unsigned char RKMTolerance::IsUsable() const
{
  return std::isfinite(m_resolution) && std::isfinite(m_smallLength) && std::isfinite(m_numericalEpsilon) &&
         m_numericalEpsilon > 0.0 && m_smallLength > 0.0 && m_smallLength <= m_resolution;
}

const RKMTolerance &RKMGetDefaultTolerance()
{
  static const RKMTolerance tolerance;
  return tolerance;
}

HRESULT RKMToleranceError(const RKMTolerance &tolerance) { return tolerance.IsUsable() ? S_OK : E_INVALIDARG; }
