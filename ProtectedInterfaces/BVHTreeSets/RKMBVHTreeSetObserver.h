#pragma once

#include "RKMExport.h"
#include "RKMPolyObserver.h"

class RKMBVHTree;
class RKMMathTransformation;

/// Told of each change asked of a tree set, before the set acts on it.
class RKM_EXPORT RKMBVHTreeSetObserver : public RKMPolyObserver<RKMBVHTreeSetObserver>
{
public:
  virtual void OnAddTree(int id, RKMBVHTree *tree, const RKMMathTransformation *position) = 0;
  virtual void OnModifyTreePosition(int id, const RKMMathTransformation *position) = 0;
  virtual void OnDesactivateTree(int id) = 0;
  virtual void OnActivateTree(int id) = 0;
  virtual void OnDeactivateAll() = 0;
  virtual void OnActivateAll() = 0;
  virtual void OnRemoveTree(int id) = 0;
  virtual void OnVirtualRemoveTree(int id) = 0;
  virtual void OnFlushTree(int id) = 0;
  /// This observer's part of RKMBVHTreeSet::CheckPoint.
  virtual int OnCheckPoint() = 0;

protected:
  ~RKMBVHTreeSetObserver() override;
};
