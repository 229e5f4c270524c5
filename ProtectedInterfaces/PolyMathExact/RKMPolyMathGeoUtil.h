#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathBox;
class RKMMathBox2D;

/// Geometric helpers on elementary types.
class RKM_EXPORT RKMPolyMathGeoUtil
{
public:
  /// The largest absolute value among the box's limits; E_FAIL with 0 for an empty box.
  static HRESULT GetMaximumCoordinate(const RKMMathBox2D &box, double &maxCoord);
  static HRESULT GetMaximumCoordinate(const RKMMathBox &box, double &maxCoord);
};
