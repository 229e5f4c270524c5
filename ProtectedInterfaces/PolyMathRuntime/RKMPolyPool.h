#pragma once

#include "RKMExport.h"

struct RKMSysPool;

/// A table of 32 pool pointers, zeroed when built and when destroyed.
class RKM_EXPORT PoolMap
{
public:
  PoolMap();
  ~PoolMap();
  void *m_pools[32];
};

/// The process-wide allocation pool of the library's small, hot objects (nodes, volumes). Every
/// operation is safe from any thread; a block may be freed by another thread than the one that took it.
class RKM_EXPORT RKMPolyPool
{
public:
  /// Created on first use, kept for the life of the process.
  static RKMSysPool *GetDefaultPool();
  /// A block of size bytes, or null when memory runs out.
  static void *AllocateObjectInTSPool(unsigned size);
  static void *AllocateObjectInDefaultPool(unsigned size);
  /// Returns a block of either allocation; null is ignored.
  static void FreeObjectFromPool(void *block);
  static void RegisterTSPool(void *) {}
  static void ReleaseTSPool(void *) {}

  static PoolMap _PtrToPools;

private:
  RKMPolyPool() = default;
  ~RKMPolyPool() = default;
};
