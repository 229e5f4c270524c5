#include "RKMBVHNode.h"
#include "RKMBVHNodeListIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeSet.h"
#include "RKMBVHTreeSetAttribute.h"
#include "RKMBVHTreeSetObserver.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyDebugStackTrace.h"
#include "RKMPolyScopedMutex.h"
#include "RKMRef.h"
#include "RKMSetOfInt.h"

#include "RKMMathTransformation.h"
#include "RKMMutex.h"
#include "RKMSysServices.h"

#include <mutex>
#include <new>
#include <optional>
#include <vector>

const RKMMathTransformation RKMBVHTreeSet::_Identity;

namespace
{
unsigned HashId(RKMWord w) { return RKMSetOfInt::HashKey(RKMIntOfWord(w)); }

typedef void (*MonitorFunction)(void *);

MonitorFunction Monitor(bool registration)
{
  static MonitorFunction reg = nullptr, unreg = nullptr;
  static std::once_flag regOnce, unregOnce;
  if (registration)
    std::call_once(regOnce, [] {
      reg = reinterpret_cast<MonitorFunction>(
          RKMQNVDynamicFunction("RKMRuvivirazaReziZazuzaviz", "RegisterRKMBVHTreeSetCinderZezadaze"));
    });
  else
    std::call_once(unregOnce, [] {
      unreg = reinterpret_cast<MonitorFunction>(
          RKMQNVDynamicFunction("RKMRuvivirazaReziZazuzaviz", "UnregisterRKMBVHTreeSetCinderZezadaze"));
    });
  return registration ? reg : unreg;
}

RKMBVHTreeSetAttribute *AttributeOf(const RKMBVHNodeConst *leaf)
{
  return leaf ? static_cast<RKMBVHTreeSetAttribute *>(leaf->GetAttribute()) : nullptr;
}

// The placement of an object: a transformation whose matrix is not a pure scaling has its matrix
// replaced by the nearest isometry (rounding drift in a rotation is not let grow the volumes).
bool Placement(const RKMMathTransformation *T, RKMMathTransformation &P)
{
  if (!T)
    return false;
  P = *T;
  RKMMath3x3Matrix iso;
  if (!T->GetMatrix().IsScaling() && T->GetMatrix().MakeIsometry(iso))
    P.SetMatrix(iso);
  return true;
}

RKMBVHTree *LoadTree(RKMBVHTree *const *slot) { return __atomic_load_n(slot, __ATOMIC_ACQUIRE); }
void StoreTree(RKMBVHTree **slot, RKMBVHTree *tree) { __atomic_store_n(slot, tree, __ATOMIC_RELEASE); }
}

RKMBVHTreeSet::RKMBVHTreeSet(RKMBVHTreeBuilder::SpatialOptimization optimization,
                             RKMPolyBoundingVolume::TypeID volumeType, Type type)
    : m_optimization(optimization), m_volumeType(volumeType), m_leafById(0, nullptr, HashId), m_type(type),
      m_mutex(new (std::nothrow) RKMMutex(0, 1, 0))
{
  m_trace.Construct(R"(RKMBVHTreeSet::RKMBVHTreeSet [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:__LINE__])", 11);
  if (m_type == 0)
    if (MonitorFunction f = Monitor(true))
      f(this);
}

RKMBVHTreeSet::~RKMBVHTreeSet()
{
  OverAllTreeNeedsUpdate();
  for (int i = 1; i <= m_leaves.Size(); ++i)
    delete m_leaves[i];
  m_leaves.RemoveAll();
  m_leafById.RemoveAll();
  if (m_type == 0)
    if (MonitorFunction f = Monitor(false))
      f(this);
  RKMPolyObserver<RKMBVHTreeSetObserver>::ReleaseChain(m_observers);
  // The mutex goes last: nothing above may need it once it is gone.
  delete m_mutex;
  m_mutex = nullptr;
}

template <class Call>
void RKMBVHTreeSet::Notify(Call call)
{
  std::vector<RKMBVHTreeSetObserver *> observers;
  {
    // Without its mutex (it could not be allocated) the set takes its observers unlocked.
    std::optional<RKMPolyScopedMutex> lock;
    if (m_mutex)
      lock.emplace(*m_mutex);
    RKMPolyObserver<RKMBVHTreeSetObserver>::Snapshot(m_observers, observers);
  }
  for (RKMBVHTreeSetObserver *o : observers)
    call(*o);
  RKMPolyObserver<RKMBVHTreeSetObserver>::ReleaseSnapshot(observers);
}

RKMBVHNode *RKMBVHTreeSet::Leaf(int id) const
{
  RKMWord w = 0;
  return m_leafById.Locate(RKMWordOfInt(id), w) ? reinterpret_cast<RKMBVHNode *>(w) : nullptr;
}

RKMBVHNodeIterator &RKMBVHTreeSet::Begin()
{
  m_position = 1;
  return *this;
}

unsigned char RKMBVHTreeSet::End() const { return m_position > m_leaves.Size(); }

RKMBVHNodeIterator &RKMBVHTreeSet::operator++()
{
  ++m_position;
  return *this;
}

RKMBVHNode *RKMBVHTreeSet::operator*() const { return static_cast<RKMBVHNode *>(m_leaves[m_position]); }

int RKMBVHTreeSet::CheckPoint()
{
  int result = -1;
  Notify([&result](RKMBVHTreeSetObserver &o) { result &= o.OnCheckPoint(); });
  return result;
}

RKMPolyBoundingVolume *RKMBVHTreeSet::ApplySmartTransformation(const RKMPolyBoundingVolume *bv,
                                                               const RKMMathTransformation *T)
{
  if (!bv)
    return nullptr;
  if (!T)
    return RKMPolyBVClone::Clone(bv);
  RKMPolyBoundingVolume *placed = nullptr;
  return SUCCEEDED(RKMPolyBVOperations::CreateTransformedInstance(*bv, *T, placed)) ? placed : nullptr;
}

HRESULT RKMBVHTreeSet::AddTree(int id, RKMBVHTree *tree, const RKMMathTransformation *position)
{
  Notify([&](RKMBVHTreeSetObserver &o) { o.OnAddTree(id, tree, position); });
  return ProtectedAddTree(id, tree, position);
}

HRESULT RKMBVHTreeSet::ProtectedAddTree(int id, RKMBVHTree *tree, const RKMMathTransformation *position)
{
  if (!tree)
    return E_INVALIDARG;
  const RKMBVHNodeConst *root = tree->GetRoot();
  if (!root)
    return E_FAIL;
  RKMMathTransformation P;
  const bool placed = Placement(position, P);
  RKMBVHTreeSetAttribute *attribute = new RKMBVHTreeSetAttribute;
  if (!attribute)
    return E_OUTOFMEMORY;
  // The leaf's reference: the attribute holds it only once the leaf is complete, and a failure
  // releases it.
  RKMRef<RKMBVHTree> reference = RKMRef<RKMBVHTree>::Share(tree);
  attribute->objectId = id;
  attribute->position = placed ? P : _Identity;
  RKMPolyBoundingVolume *first = ApplySmartTransformation(root->GetFirstBoundingVolume(), placed ? &P : nullptr);
  RKMPolyBoundingVolume *second = ApplySmartTransformation(root->GetSecondBoundingVolume(), placed ? &P : nullptr);
  RKMBVHNode *leaf = new RKMBVHNode(first);
  // Whatever could not be made is undone.
  if (!leaf || (root->GetFirstBoundingVolume() && !first) || (root->GetSecondBoundingVolume() && !second) ||
      !m_leaves.Append(leaf))
  {
    if (leaf)
      delete leaf;
    else
      delete first;
    delete second;
    delete attribute;
    return E_OUTOFMEMORY;
  }
  attribute->tree = reference.Detach();
  leaf->SetSecondBoundingVolume(second);
  leaf->SetAttribute(attribute);
  OverAllTreeNeedsUpdate();
  return m_leafById.Insert(RKMWordOfInt(id), reinterpret_cast<RKMWord>(leaf));
}

HRESULT RKMBVHTreeSet::RemoveTree(int id)
{
  Notify([id](RKMBVHTreeSetObserver &o) { o.OnRemoveTree(id); });
  return VirtualRemoveTree(id);
}

HRESULT RKMBVHTreeSet::VirtualRemoveTree(int id)
{
  Notify([id](RKMBVHTreeSetObserver &o) { o.OnVirtualRemoveTree(id); });
  RKMBVHNode *leaf = Leaf(id);
  if (!leaf)
    return E_INVALIDARG;
  OverAllTreeNeedsUpdate();
  m_leafById.Remove(RKMWordOfInt(id));
  m_leaves.RemoveValue(leaf);
  delete leaf;
  return S_OK;
}

HRESULT RKMBVHTreeSet::ModifyTreePosition(int id, const RKMMathTransformation *position)
{
  Notify([&](RKMBVHTreeSetObserver &o) { o.OnModifyTreePosition(id, position); });
  RKMBVHNode *leaf = Leaf(id);
  RKMBVHTreeSetAttribute *attribute = AttributeOf(leaf);
  const RKMBVHNodeConst *root = attribute && attribute->tree ? attribute->tree->GetRoot() : nullptr;
  if (!root)
    return E_INVALIDARG;
  RKMMathTransformation P;
  const bool placed = Placement(position, P);
  // The new volumes are made before the old ones go, so that a failure leaves the object where it was.
  RKMPolyBoundingVolume *first = ApplySmartTransformation(root->GetFirstBoundingVolume(), placed ? &P : nullptr);
  RKMPolyBoundingVolume *second = nullptr;
  const bool hadSecond = leaf->GetSecondBoundingVolume() != nullptr;
  if (hadSecond)
    second = ApplySmartTransformation(root->GetSecondBoundingVolume(), placed ? &P : nullptr);
  if ((root->GetFirstBoundingVolume() && !first) || (hadSecond && root->GetSecondBoundingVolume() && !second))
  {
    delete first;
    delete second;
    return E_OUTOFMEMORY;
  }
  delete leaf->GetFirstBoundingVolume();
  leaf->SetFirstBoundingVolume(first);
  if (hadSecond)
  {
    delete leaf->GetSecondBoundingVolume();
    leaf->SetSecondBoundingVolume(second);
  }
  attribute->position = placed ? P : _Identity;
  OverAllTreeNeedsUpdate();
  return S_OK;
}

HRESULT RKMBVHTreeSet::FlushTree(int id)
{
  Notify([id](RKMBVHTreeSetObserver &o) { o.OnFlushTree(id); });
  RKMBVHTreeSetAttribute *attribute = AttributeOf(Leaf(id));
  if (!attribute || !attribute->tree)
    return E_INVALIDARG;
  attribute->tree->FlushMemory();
  return S_OK;
}

HRESULT RKMBVHTreeSet::GetObjectNode(int id, const RKMBVHNodeConst *&node) const
{
  RKMBVHNode *leaf = Leaf(id);
  if (!leaf)
    return E_FAIL;
  node = leaf;
  return S_OK;
}

HRESULT RKMBVHTreeSet::SetFlagOnTree(int id, int value)
{
  OverAllTreeNeedsUpdate();
  RKMBVHTreeSetAttribute *attribute = AttributeOf(Leaf(id));
  if (!attribute)
    return E_INVALIDARG;
  attribute->deactivated = value;
  return S_OK;
}

HRESULT RKMBVHTreeSet::SetFlagOnAll(int value)
{
  OverAllTreeNeedsUpdate();
  for (int i = 1; i <= m_leaves.Size(); ++i)
    if (RKMBVHTreeSetAttribute *attribute = AttributeOf(m_leaves[i]))
      attribute->deactivated = value;
  return S_OK;
}

HRESULT RKMBVHTreeSet::DesactivateTree(int id)
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::DesactivateTree [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:311])", 9);
  Notify([id](RKMBVHTreeSetObserver &o) { o.OnDesactivateTree(id); });
  return SetFlagOnTree(id, 1);
}

HRESULT RKMBVHTreeSet::ActivateTree(int id)
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::ActivateTree [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:323])", 9);
  Notify([id](RKMBVHTreeSetObserver &o) { o.OnActivateTree(id); });
  return SetFlagOnTree(id, 0);
}

HRESULT RKMBVHTreeSet::DeactivateAll()
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::DeactivateAll [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:429])", 9);
  Notify([](RKMBVHTreeSetObserver &o) { o.OnDeactivateAll(); });
  return SetFlagOnAll(1);
}

HRESULT RKMBVHTreeSet::ActivateAll()
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::ActivateAll [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:441])", 9);
  Notify([](RKMBVHTreeSetObserver &o) { o.OnActivateAll(); });
  return SetFlagOnAll(0);
}

void RKMBVHTreeSet::RecursivelyDestroyIntermediateNodes(RKMBVHNode *node)
{
  // From an explicit stack: the inner nodes of a degenerate overall tree may be many levels deep.
  std::vector<RKMBVHNode *> pending, inner;
  try
  {
    if (node)
      pending.push_back(node);
    while (!pending.empty())
    {
      RKMBVHNode *n = pending.back();
      pending.pop_back();
      const int count = n->GetNbChildren();
      if (count == 0)
        continue;
      inner.push_back(n);
      RKMListPtrRKMBVHNodeConst &children = n->GetChildren();
      for (int i = 1; i <= count; ++i)
        if (children[i])
          pending.push_back(static_cast<RKMBVHNode *>(children[i]));
    }
  }
  catch (...)
  {
  }
  for (RKMBVHNode *n : inner)
  {
    n->RemoveAllChildren();
    delete n;
  }
}

void RKMBVHTreeSet::OverAllTreeNeedsUpdate()
{
  // The set's reference, released once the tree no longer holds the leaves.
  const RKMRef<RKMBVHTree> tree = RKMRef<RKMBVHTree>::Adopt(LoadTree(&m_overAllTree));
  if (!tree)
    return;
  StoreTree(&m_overAllTree, nullptr);
  RKMBVHNode *root = static_cast<RKMBVHNode *>(tree->GetRoot());
  RecursivelyDestroyIntermediateNodes(root);
  tree->UnregisterRootNode();
}

void RKMBVHTreeSet::RebuildOverAllTree()
{
  RKMListPtrRKMBVHNodeConst active;
  for (int i = 1; i <= m_leaves.Size(); ++i)
  {
    RKMBVHNodeConst *leaf = m_leaves[i];
    RKMBVHTreeSetAttribute *attribute = AttributeOf(leaf);
    // An overall tree that left an object out would hide its clashes: without memory for the list
    // there is no overall tree at all, and GetTree says so with a null.
    if ((!leaf || !attribute || !(attribute->deactivated & 1)) && !active.Append(leaf))
      return;
  }
  if (active.Size() == 0)
    return;
  RKMBVHNodeListIterator iterator(active, active.Size());
  RKMBVHTree *tree = nullptr;
  const HRESULT hr = RKMBVHTreeBuilder(m_optimization).Run(iterator, tree);
  if (FAILED(hr) || !tree)
    return;
  StoreTree(&m_overAllTree, tree);
}

RKMBVHTree *RKMBVHTreeSet::GetTree()
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::GetTree [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:524])", 9);
  if (RKMBVHTree *tree = LoadTree(&m_overAllTree))
  {
    tree->AddRef();
    return tree;
  }
  if (!m_mutex)
    return nullptr;
  RKMPolyScopedMutex lock(*m_mutex);
  RKMBVHTree *tree = LoadTree(&m_overAllTree);
  if (!tree)
  {
    RebuildOverAllTree();
    tree = LoadTree(&m_overAllTree);
  }
  if (tree)
    tree->AddRef();
  return tree;
}

RKMBVHTree *RKMBVHTreeSet::GetTree(const RKMBVHNodeConst &leaf)
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::GetTree [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:375])", 9);
  RKMBVHTreeSetAttribute *attribute = AttributeOf(&leaf);
  return attribute ? attribute->tree : nullptr;
}

unsigned char RKMBVHTreeSet::IsActivated(const RKMBVHNodeConst &leaf)
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeSet::IsActivated [RezazizuviVaveverodiz\BVHObjects.m\src\RKMBVHTreeSet:355])", 9);
  RKMBVHTreeSetAttribute *attribute = AttributeOf(&leaf);
  return !attribute || !(attribute->deactivated & 1);
}

int RKMBVHTreeSet::GetObjectId(const RKMBVHNodeConst &leaf)
{
  RKMBVHTreeSetAttribute *attribute = AttributeOf(&leaf);
  return attribute ? attribute->objectId : -1;
}

const RKMMathTransformation &RKMBVHTreeSet::GetPosition(const RKMBVHNodeConst &leaf)
{
  RKMBVHTreeSetAttribute *attribute = AttributeOf(&leaf);
  return attribute ? attribute->position : _Identity;
}

const RKMMathTransformation *RKMBVHTreeSet::GetTransformation(const RKMBVHNodeConst &leaf)
{
  RKMBVHTreeSetAttribute *attribute = AttributeOf(&leaf);
  return attribute ? &attribute->position : nullptr;
}

void RKMBVHTreeSet::RegisterObserver(RKMBVHTreeSetObserver *observer)
{
  if (!m_mutex)
    return;
  RKMPolyScopedMutex lock(*m_mutex);
  RKMPolyObserver<RKMBVHTreeSetObserver>::Register(m_observers, observer);
}

void RKMBVHTreeSet::UnregisterObserver(RKMBVHTreeSetObserver *observer)
{
  if (!m_mutex)
    return;
  RKMPolyScopedMutex lock(*m_mutex);
  RKMPolyObserver<RKMBVHTreeSetObserver>::Unregister(m_observers, observer);
}
