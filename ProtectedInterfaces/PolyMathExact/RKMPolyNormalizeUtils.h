#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathBox;
class RKMMathBox2D;
class RKMMathPoint;
class RKMMathPoint2D;
class RKMPolyExactArithmetic;

/// Snapping of boxes and point sets onto the grid of an exact arithmetic. Each call returns S_OK, or
/// E_FAIL with the box (and points) unchanged when a limit would move by more than ε or is not a
/// number, the box is empty or its largest coordinate is not finite.
class RKM_EXPORT RKMPolyNormalizeUtils
{
public:
  /// Snaps the box's limits in the Gridded mode; any other mode returns S_OK and leaves it unchanged.
  static HRESULT Normalize(const RKMPolyExactArithmetic &arithmetic, RKMMathBox2D &box);
  static HRESULT Normalize(const RKMPolyExactArithmetic &arithmetic, RKMMathBox &box);
  /// Sets the arithmetic's maximum coordinate to the box's largest absolute limit, then snaps the
  /// box. A null arithmetic is replaced by a new Gridded one that the caller owns (E_OUTOFMEMORY if it
  /// cannot be made); an existing one is reconfigured. Nothing is created or changed when the box is
  /// empty or its largest limit is not finite as a float.
  static HRESULT NormalizeBoundingBox(RKMMathBox2D &box, RKMPolyExactArithmetic *&arithmetic);
  static HRESULT NormalizeBoundingBox(RKMMathBox &box, RKMPolyExactArithmetic *&arithmetic);
  /// Fills box with the n points, sets up the arithmetic as NormalizeBoundingBox, then snaps the
  /// points. E_INVALIDARG for null points with n > 0; n < 1 leaves an empty box and E_FAIL.
  static HRESULT NormalizePoints(RKMMathPoint2D *points, int n, RKMMathBox2D &box,
                                 RKMPolyExactArithmetic *&arithmetic);
  static HRESULT NormalizePoints(RKMMathPoint *points, int n, RKMMathBox &box, RKMPolyExactArithmetic *&arithmetic);
};
