#include "RKMBVHAttribute.h"
#include "RKMBVHNode.h"
#include "RKMBVHNodeConst.h"
#include "RKMBVHNodeIterator.h"
#include "RKMListPtrRKMBVHNodeConst.h"
#include "RKMPolyAtomicOperations.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingVolume.h"
#include "RKMPolyPool.h"

#include "RKMInterlocked.h"

#include <vector>

RKMListPtrRKMBVHNodeConst::~RKMListPtrRKMBVHNodeConst() = default;

RKMBVHNodeIterator::~RKMBVHNodeIterator() = default;

RKMBVHNodeConst::~RKMBVHNodeConst()
{
  // The subtree is deleted from an explicit stack: each node's children are taken over before it is
  // deleted, so no destructor recurses and a chain of any depth cannot overflow the call stack. A node
  // whose children cannot be taken over (no memory for the stack) keeps them and deletes them itself,
  // the recursive way.
  std::vector<RKMBVHNodeConst *> pending;
  auto takeChildren = [&pending](RKMBVHNodeConst &n) {
    const size_t before = pending.size();
    try
    {
      for (int i = n.m_children.Size(); i >= 1; --i)
        if (RKMBVHNodeConst *c = n.m_children[i])
          pending.push_back(c);
    }
    catch (...)
    {
      pending.resize(before);
      return;
    }
    n.m_children.RemoveAll();
  };
  takeChildren(*this);
  while (!pending.empty())
  {
    RKMBVHNodeConst *n = pending.back();
    pending.pop_back();
    takeChildren(*n);
    delete n;
  }
  for (int i = 1; i <= m_children.Size(); ++i)
    delete m_children[i];
  m_children.RemoveAll();
  delete m_bv1;
  m_bv1 = nullptr;
  delete m_bv2;
  m_bv2 = nullptr;
  delete m_attribute;
  m_attribute = nullptr;
}

void RKMBVHNodeConst::ForceExpand()
{
  RKMListPtrRKMBVHNodeConst &children = GetChildren();
  for (int i = 1; i <= children.Size(); ++i)
    if (RKMBVHNodeConst *c = children[i])
      c->ForceExpand();
}

void RKMBVHNodeConst::ForceCollapse(int level)
{
  RKMListPtrRKMBVHNodeConst &children = GetChildren();
  for (int i = 1; i <= children.Size(); ++i)
    if (RKMBVHNodeConst *c = children[i])
      c->ForceCollapse(level);
}

void RKMBVHNodeConst::FlushMemory()
{
  RKMListPtrRKMBVHNodeConst &children = GetChildren();
  for (int i = 1; i <= children.Size(); ++i)
    if (RKMBVHNodeConst *c = children[i])
      c->FlushMemory();
  if (m_attribute)
    m_attribute->FlushComputedData();
}

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

RKMBVHAttribute::RKMBVHAttribute(const RKMBVHAttribute &other) : m_flags(RKMInterlockedRead(&other.m_flags)) {}

RKMBVHAttribute &RKMBVHAttribute::operator=(const RKMBVHAttribute &other)
{
  __atomic_store_n(&m_flags, RKMInterlockedRead(&other.m_flags), __ATOMIC_SEQ_CST);
  return *this;
}

RKMBVHAttribute::~RKMBVHAttribute() = default;

RKMGeomBVHAttribute *RKMBVHAttribute::CastAsGeomAttribute() { return nullptr; }
const RKMGeomBVHAttribute *RKMBVHAttribute::CastAsGeomAttribute() const { return nullptr; }
RKMBVHVisuAttribute *RKMBVHAttribute::CastAsVisuAttribute() { return nullptr; }
const RKMBVHVisuAttribute *RKMBVHAttribute::CastAsVisuAttribute() const { return nullptr; }
RKMBodyBVHAttribute *RKMBVHAttribute::CastAsBodyAttribute() { return nullptr; }
const RKMBodyBVHAttribute *RKMBVHAttribute::CastAsBodyAttribute() const { return nullptr; }
RKMPolyBVHAttribute *RKMBVHAttribute::CastAsPolyAttribute() { return nullptr; }
const RKMPolyBVHAttribute *RKMBVHAttribute::CastAsPolyAttribute() const { return nullptr; }
RKMTessBVHAttribute *RKMBVHAttribute::CastAsTessAttribute() { return nullptr; }
const RKMTessBVHAttribute *RKMBVHAttribute::CastAsTessAttribute() const { return nullptr; }
void RKMBVHAttribute::FlushComputedData() {}

void RKMBVHAttribute::EnableFlag(FlagType bits) { RKMPolyAtomicOperations::BitWiseOr(&m_flags, bits); }

void RKMBVHAttribute::DisableFlag(FlagType bits) { RKMPolyAtomicOperations::BitWiseTestAndReset(&m_flags, bits); }

unsigned char RKMBVHAttribute::TestFlag(FlagType bits) const
{
  // Any tested bit set reads as true, whichever byte of the word it is in.
  return (RKMInterlockedCompareExchange(&m_flags, 0, 0) & bits) != 0;
}
