#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathPoint;
class RKMPolyExactArithmetic;

/// Read access to positions held on the grid of an exact arithmetic, which must outlive it. Users
/// derive from it to hand their snapped geometry to exact tests.
class RKM_EXPORT RKMPolyGriddedPositionsConst
{
public:
  explicit RKMPolyGriddedPositionsConst(const RKMPolyExactArithmetic &arithmetic);
  RKMPolyGriddedPositionsConst(const RKMPolyGriddedPositionsConst &other);
  virtual ~RKMPolyGriddedPositionsConst();

  const RKMPolyExactArithmetic &GetExactArithmetic() const { return *m_arithmetic; }

  /// The snapped position of the given index: S_OK, or a failure with p unchanged for an unknown index.
  virtual HRESULT GetPosition(int index, RKMMathPoint &p) const = 0;

private:
  const RKMPolyExactArithmetic *m_arithmetic;
};
