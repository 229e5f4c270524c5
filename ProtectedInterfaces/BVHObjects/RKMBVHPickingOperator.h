#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMBVHPickingCallback;
class RKMBVHTree;
class RKMMathPoint;
class RKMMathVector;

/// Picking along a ray with a callback. This library does not carry out picking: Run reports failure.
class RKM_EXPORT RKMBVHPickingOperator
{
public:
  RKMBVHPickingOperator(RKMBVHPickingCallback &callback, double tolerance)
      : m_callback(callback), m_tolerance(tolerance)
  {
  }
  /// E_FAIL, whatever the input; the callback is not called.
  HRESULT Run(const RKMBVHTree &tree, const RKMMathPoint &origin, const RKMMathVector &direction);
  double GetTolerance() const { return m_tolerance; }

private:
  RKMBVHPickingCallback &m_callback;
  double m_tolerance;
};
