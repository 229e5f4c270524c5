// RKMPolyPool and PoolMap, the table of pools it publishes: both are declared in RKMPolyPool.h.
#include "RKMPolyPool.h"

#include "RKMSysAllocator.h"

#include <cstring>

PoolMap::PoolMap() { std::memset(m_pools, 0, sizeof m_pools); }

PoolMap::~PoolMap() { std::memset(m_pools, 0, sizeof m_pools); }

PoolMap RKMPolyPool::_PtrToPools;

RKMSysPool *RKMPolyPool::GetDefaultPool()
{
  static RKMSysPool *const pool = RKMSysCreatePool(0x400048, 0, "RKMPolyPool");
  return pool;
}

void *RKMPolyPool::AllocateObjectInTSPool(unsigned size)
{
  return RKMSpecializedNew(size, GetDefaultPool(), nullptr, 0, 0x400000);
}

void *RKMPolyPool::AllocateObjectInDefaultPool(unsigned size) { return AllocateObjectInTSPool(size); }

void RKMPolyPool::FreeObjectFromPool(void *block) { RKMSpecializedDelete(block, nullptr, 0x400000); }
