#include "RKMBVHTree.h"
#include "RKMBVHTreeSetAttribute.h"
#include "RKMPolyPool.h"

RKMBVHTreeSetAttribute::~RKMBVHTreeSetAttribute()
{
  if (tree)
    tree->Release();
  tree = nullptr;
}

void *RKMBVHTreeSetAttribute::operator new(std::size_t size) noexcept
{
  return size > 0xFFFFFFFFu ? nullptr : RKMPolyPool::AllocateObjectInTSPool(static_cast<unsigned>(size));
}

void RKMBVHTreeSetAttribute::operator delete(void *p) noexcept { RKMPolyPool::FreeObjectFromPool(p); }
