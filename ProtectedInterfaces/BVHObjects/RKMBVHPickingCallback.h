#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMBVHNodeConst;

/// What a picking run reports to its caller: candidates, hits and the end of the run.
class RKM_EXPORT RKMBVHPickingCallback
{
public:
  virtual ~RKMBVHPickingCallback();
  /// A leaf whose volume the pick ray meets.
  virtual HRESULT OnCandidate(const RKMBVHNodeConst &leaf) = 0;
  /// A hit at the given ray parameter.
  virtual HRESULT OnHit(const RKMBVHNodeConst &leaf, double parameter) = 0;
  virtual void OnEnd() = 0;
};
