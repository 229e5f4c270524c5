#pragma once

#include "RKMExport.h"

#include <cstddef>

/// A named allocation pool. Pools live for the whole process.
struct RKMSysPool;

/// Creates a pool; blockSize 0 serves any size. Null when memory runs out.
RKM_EXPORT RKMSysPool *RKMSysCreatePool(unsigned flags, size_t blockSize, const char *name);
/// A block of at least size bytes, aligned for any fundamental type, or null when memory runs out.
/// A null pool takes the process-wide default pool. Safe from any thread.
RKM_EXPORT void *RKMSpecializedNew(size_t size, RKMSysPool *pool, const void *hint = nullptr, int hint2 = 0,
                                   unsigned flags = 0);
/// Returns a block of RKMSpecializedNew to the pool it came from, whatever pool is named; null is ignored.
/// Safe from any thread.
RKM_EXPORT void RKMSpecializedDelete(void *block, RKMSysPool *pool = nullptr, unsigned flags = 0);
/// The name a pool was created with.
RKM_EXPORT const char *RKMSysGetPoolName(const RKMSysPool *pool);
