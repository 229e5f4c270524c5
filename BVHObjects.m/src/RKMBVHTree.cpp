#include "RKMBVHDescentOperator.h"
#include "RKMBVHNode.h"
#include "RKMBVHPickingCallback.h"
#include "RKMBVHPickingOperator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeObserver.h"
#include "RKMPolyDebugStackTrace.h"
#include "RKMPolyScopedMutex.h"

#include <vector>

RKMBVHTreeObserver::~RKMBVHTreeObserver() = default;

RKMBVHTree::RKMBVHTree(RKMBVHNode *root) : m_root(nullptr)
{
  m_trace.Construct(R"(RKMBVHTree::RKMBVHTree [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTree:__LINE__])", 9);
  m_root = root;
}

RKMBVHTree::~RKMBVHTree()
{
  Notify(Notice::Deletion);
  RKMBVHTreeObserver *first = nullptr;
  {
    RKMPolyScopedMutex lock(m_observerLock);
    first = m_observers;
    m_observers = nullptr;
  }
  // Each observer is unlinked before the chain's reference to it is dropped: an observer that a caller
  // still holds must not keep the later ones linked (and referenced) after the tree is gone.
  while (first)
  {
    RKMBVHTreeObserver *next = first->Next();
    first->SetNext(nullptr);
    first->SetPrev(nullptr);
    if (next)
      next->SetPrev(nullptr);
    first->Release();
    first = next;
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
  // The chain is copied under the lock, each observer with a reference of its own: an observer may then
  // unregister itself or another during the calls (the lock is not held) and every one copied stays
  // alive until its turn has passed.
  std::vector<RKMBVHTreeObserver *> observers;
  {
    RKMPolyScopedMutex lock(m_observerLock);
    try
    {
      for (RKMBVHTreeObserver *o = m_observers; o; o = o->Next())
        observers.push_back(o);
    }
    catch (...)
    {
    }
    for (RKMBVHTreeObserver *o : observers)
      o->AddRef();
  }
  for (RKMBVHTreeObserver *o : observers)
  {
    if (notice == Notice::Deletion)
      o->OnTreeDeletion();
    else
      o->OnTreeFlush();
  }
  for (RKMBVHTreeObserver *o : observers)
    o->Release();
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

RKMBVHPickingCallback::~RKMBVHPickingCallback() = default;

HRESULT RKMBVHPickingOperator::Run(const RKMBVHTree &, const RKMMathPoint &, const RKMMathVector &) { return E_FAIL; }
