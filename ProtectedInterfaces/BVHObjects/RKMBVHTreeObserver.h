#pragma once

#include "RKMExport.h"
#include "RKMPolyObserver.h"

/// Told when a tree it observes is destroyed or flushed. An observer that needs the tree keeps its own
/// pointer to it.
class RKM_EXPORT RKMBVHTreeObserver : public RKMPolyObserver<RKMBVHTreeObserver>
{
public:
  virtual void OnTreeDeletion() = 0;
  virtual void OnTreeFlush() = 0;

protected:
  ~RKMBVHTreeObserver() override;
};
