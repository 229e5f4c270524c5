#pragma once

#include "RKMPolyGriddedPositionsConst.h"

/// Positions on the grid of an exact arithmetic that can also be written.
class RKM_EXPORT RKMPolyGriddedPositions : public RKMPolyGriddedPositionsConst
{
public:
  explicit RKMPolyGriddedPositions(const RKMPolyExactArithmetic &arithmetic);
  RKMPolyGriddedPositions(const RKMPolyGriddedPositions &other);
  ~RKMPolyGriddedPositions() override;

  /// Stores p, snapped onto the arithmetic's grid, at the given index: S_OK, or a failure with
  /// nothing stored.
  virtual HRESULT SetPosition(int index, const RKMMathPoint &p) = 0;
};
