#include "RKMBVHAttribute.h"
#include "RKMBVHNodeConst.h"
#include "RKMPolyBoundingVolume.h"

#include <vector>

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
