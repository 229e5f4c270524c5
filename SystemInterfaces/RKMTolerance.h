#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

/// Length thresholds of a model, in model units.
class RKM_EXPORT RKMTolerance
{
public:
  /// The defaults: resolution 1e-3, small length 1e-6, numerical epsilon 1e-12.
  RKMTolerance();
  RKMTolerance(double resolution, double smallLength, double numericalEpsilon);

  /// Shortest length the model tells apart.
  double GetResolution() const { return m_resolution; }
  double GetSquareResolution() const { return m_resolution * m_resolution; }
  /// Length under which a direction or an offset counts as null.
  double GetSmallLength() const { return m_smallLength; }
  double GetSquareSmallLength() const { return m_smallLength * m_smallLength; }
  /// Relative threshold, dimensionless.
  double GetNumericalEpsilon() const { return m_numericalEpsilon; }
  /// True when every value is finite and 0 < epsilon, 0 < small length ≤ resolution.
  unsigned char IsUsable() const;

private:
  double m_resolution;
  double m_smallLength;
  double m_numericalEpsilon;
};

/// The process-wide default tolerance, built once.
RKM_EXPORT const RKMTolerance &RKMGetDefaultTolerance();
/// Reports an unusable tolerance: E_INVALIDARG when it is unusable, S_OK otherwise. Prints nothing.
RKM_EXPORT HRESULT RKMToleranceError(const RKMTolerance &tolerance);
