#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathPoint2D;

/// Builds the coordinates of the crossing point of segments ab and cd, once the crossing has been
/// established exactly.
class RKM_EXPORT RKMPolyIntersectionPointConstructor2D
{
public:
  virtual ~RKMPolyIntersectionPointConstructor2D();
  /// S_OK with out set, or a failure with out unchanged.
  virtual HRESULT Compute(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                          const RKMMathPoint2D &d, RKMMathPoint2D &out) const = 0;
};
