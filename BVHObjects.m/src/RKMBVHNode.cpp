#include "RKMBVHNode.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingVolume.h"
#include "RKMPolyPool.h"

void *RKMBVHNode::operator new(std::size_t size) noexcept
{
  return size > 0xFFFFFFFFu ? nullptr : RKMPolyPool::AllocateObjectInTSPool(static_cast<unsigned>(size));
}

void RKMBVHNode::operator delete(void *p) noexcept { RKMPolyPool::FreeObjectFromPool(p); }

HRESULT RKMBVHNode::AddChild(RKMBVHNodeConst *child) { return m_children.Append(child); }

namespace
{
// A volume that holds all of space: it overlaps everything, so no walk prunes what lies under it.
RKMPolyBoundingVolume *AllSpace()
{
  RKMPolyBoundingPlane *slab = new RKMPolyBoundingPlane;
  if (slab)
    slab->SetInfinitelyThick(1);
  return slab;
}

// Grows volume over other. When no volume of its kind can hold other, or memory runs out, volume is
// replaced by all of space (or, failing even that, kept: the caller's hierarchy is then as it was).
void Enclose(RKMPolyBoundingVolume *&volume, const RKMPolyBoundingVolume *other)
{
  if (other->GetTypeID() == RKMPolyBoundingVolume::TypePlane && volume->GetTypeID() != RKMPolyBoundingVolume::TypePlane)
  {
    RKMPolyBoundingVolume *slab = RKMPolyBVClone::Clone(other);
    if (slab && SUCCEEDED(RKMPolyBVBVOperations::Absorb(slab, volume)))
    {
      delete volume;
      volume = slab;
      return;
    }
    delete slab;
  }
  else if (SUCCEEDED(RKMPolyBVBVOperations::Absorb(volume, other)))
    return;
  if (RKMPolyBoundingVolume *all = AllSpace())
  {
    delete volume;
    volume = all;
  }
}
}

HRESULT RKMBVHNode::AbsorbChild(RKMBVHNodeConst *child)
{
  if (!child)
    return E_INVALIDARG;
  const RKMPolyBoundingVolume *childFirst = child->GetFirstBoundingVolume();
  if (!m_bv1 || !childFirst)
    return E_FAIL;
  Enclose(m_bv1, childFirst);
  if (m_bv2)
  {
    const RKMPolyBoundingVolume *childSecond = child->GetSecondBoundingVolume();
    Enclose(m_bv2, childSecond ? childSecond : childFirst);
  }
  return m_children.Append(child);
}

HRESULT RKMBVHNode::RemoveChild(RKMBVHNodeConst *child) { return m_children.RemoveValue(child) ? S_OK : E_FAIL; }

void RKMBVHNode::RemoveAllChildren() { m_children.RemoveAll(RKMCollecReleaseAllocatedMemory); }
