#include "RKMPolyBoundingVolume.h"
#include "RKMPolyPool.h"

RKMPolyBoundingVolume::~RKMPolyBoundingVolume() = default;

void *RKMPolyBoundingVolume::operator new(std::size_t size) noexcept
{
  return size > 0xFFFFFFFFu ? nullptr : RKMPolyPool::AllocateObjectInTSPool(static_cast<unsigned>(size));
}

void RKMPolyBoundingVolume::operator delete(void *p) noexcept { RKMPolyPool::FreeObjectFromPool(p); }
