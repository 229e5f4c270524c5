#include "RKMBVHNode.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeObserver.h"
#include "RKMPolyDebugStackTrace.h"
#include "RKMPolyScopedMutex.h"

#include <vector>

RKMBVHTree::RKMBVHTree(RKMBVHNode *root) : m_root(nullptr)
{
  m_trace.Construct(R"(RKMBVHTree::RKMBVHTree [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTree:__LINE__])", 9);
  m_root = root;
}

RKMBVHTree::~RKMBVHTree()
{
  Notify(Notice::Deletion);
  {
    RKMPolyScopedMutex lock(m_observerLock);
    RKMPolyObserver<RKMBVHTreeObserver>::ReleaseChain(m_observers);
  }
  delete m_root;
  m_root = nullptr;
}

RKMBVHNodeConst *RKMBVHTree::GetRoot()
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTree::GetRoot [RezazizuviVaveverodiz\ProtectedInterfaces\RKMBVHTree:116])", 9);
  return m_root;
}

const RKMBVHNodeConst *RKMBVHTree::GetRoot() const { return m_root; }

void RKMBVHTree::UnregisterRootNode() { m_root = nullptr; }

void RKMBVHTree::RegisterObserver(RKMBVHTreeObserver *observer)
{
  RKMPolyScopedMutex lock(m_observerLock);
  RKMPolyObserver<RKMBVHTreeObserver>::Register(m_observers, observer);
}

void RKMBVHTree::UnregisterObserver(RKMBVHTreeObserver *observer)
{
  RKMPolyScopedMutex lock(m_observerLock);
  RKMPolyObserver<RKMBVHTreeObserver>::Unregister(m_observers, observer);
}

void RKMBVHTree::Notify(Notice notice)
{
  std::vector<RKMBVHTreeObserver *> observers;
  {
    RKMPolyScopedMutex lock(m_observerLock);
    RKMPolyObserver<RKMBVHTreeObserver>::Snapshot(m_observers, observers);
  }
  for (RKMBVHTreeObserver *o : observers)
  {
    if (notice == Notice::Deletion)
      o->OnTreeDeletion();
    else
      o->OnTreeFlush();
  }
  RKMPolyObserver<RKMBVHTreeObserver>::ReleaseSnapshot(observers);
}

void RKMBVHTree::FlushMemory()
{
  if (!m_root)
    return;
  Notify(Notice::Flush);
  m_root->FlushMemory();
  m_root->ForceCollapse(0);
}

HRESULT RKMBVHTree::Absorb(RKMBVHTree &) { return E_NOTIMPL; }
