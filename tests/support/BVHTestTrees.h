#pragma once

// Hierarchies for the BVH suites: an attribute that carries an id and reports its flushes and its death,
// plain trees (child lists) with a seeded random generator, seeded random leaf sets for the builders
// (nulls, volumeless entries, unbounded and crowded volumes), and the walk that checks a hierarchy:
// each node reached once, no null child, every child enclosed by its parent.

#include "RKMBVHAttribute.h"
#include "RKMBVHNode.h"
#include "RKMBVHNodeIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeObserver.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBVTestUtil.h"
#include "RKMRef.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <functional>
#include <mutex>
#include <string>
#include <unordered_map>
#include <vector>

namespace bvhtest
{
using namespace bvtest;
using NodeC = const RKMBVHNodeConst *;

// What the test objects report, in order; the mutex only matters when threads share it.
struct Journal
{
  std::mutex mutex;
  std::vector<std::string> entries;
  std::atomic<int> deaths{0};
  void Add(const std::string &e)
  {
    std::lock_guard<std::mutex> lock(mutex);
    entries.push_back(e);
  }
};

// An attribute with an id; given a journal, it counts its death there, and when named it writes
// "<name> flushed" and "<name> deleted".
struct TagAttr : RKMBVHAttribute
{
  explicit TagAttr(int i, Journal *j = nullptr, std::string n = {}) : id(i), journal(j), name(std::move(n)) {}
  ~TagAttr() override
  {
    if (journal && ++journal->deaths && !name.empty())
      journal->Add(name + " deleted");
  }
  void FlushComputedData() override
  {
    if (journal && !name.empty())
      journal->Add(name + " flushed");
  }
  int id;
  Journal *journal;
  std::string name;
};

inline int IdOf(const RKMBVHNodeConst &n) { return static_cast<const TagAttr *>(n.GetAttribute())->id; }

inline RKMBVHNode *Tagged(RKMBVHNode *n, int id, Journal *j = nullptr, const std::string &name = {})
{
  n->SetAttribute(new TagAttr(id, j, name));
  return n;
}

// A node that writes "expand <name>" and "collapse <name> <level>" to the journal before recursing.
class SpyNode : public RKMBVHNode
{
public:
  SpyNode(Journal *journal, std::string name) : m_journal(journal), m_name(std::move(name)) {}
  void ForceExpand() override { m_journal->Add("expand " + m_name), RKMBVHNode::ForceExpand(); }
  void ForceCollapse(int level) override
  {
    m_journal->Add("collapse " + m_name + " " + std::to_string(level)), RKMBVHNode::ForceCollapse(level);
  }

private:
  Journal *m_journal;
  std::string m_name;
};

// A tree observer that writes "<name> deletion" and "<name> flush" to the journal, runs the hook set for
// the call, and counts its death there; a call after its death fails (under AddressSanitizer at once).
class TreeWatcher : public RKMBVHTreeObserver
{
public:
  TreeWatcher(Journal *journal, std::string name) : m_journal(journal), m_name(std::move(name)) {}
  void OnTreeDeletion() override { Call("deletion", onDeletion); }
  void OnTreeFlush() override { Call("flush", onFlush); }
  std::function<void(TreeWatcher &)> onDeletion, onFlush;
  std::atomic<int> calls{0};

private:
  ~TreeWatcher() override
  {
    m_magic = 0;
    ++m_journal->deaths;
  }
  void Call(const char *what, const std::function<void(TreeWatcher &)> &hook)
  {
    EXPECT_EQ(m_magic, kMagic) << m_name;
    EXPECT_GE(GetRefCount(), 1) << m_name;
    ++calls;
    m_journal->Add(m_name + " " + what);
    if (hook)
      hook(*this);
  }
  static constexpr int kMagic = 0x5eed;
  Journal *m_journal;
  std::string m_name;
  int m_magic = kMagic;
};

// The tree owns the hierarchy; the holder owns the tree.
inline RKMRef<RKMBVHTree> MakeTree(RKMBVHNode *root) { return RKMRef<RKMBVHTree>::Adopt(new RKMBVHTree(root)); }

// A plain tree: p[n] lists the children of node n in order, -1 standing for a null child; 0 is the root.
using Plain = std::vector<std::vector<int>>;

// The plain tree as nodes without volumes, each tagged with its index.
inline RKMBVHNode *Build(const Plain &p, int n = 0)
{
  RKMBVHNode *node = Tagged(new RKMBVHNode, n);
  for (int c : p[n])
    node->AddChild(c < 0 ? nullptr : Build(p, c));
  return node;
}

// Shapes vary per tree: bushy or chain-like, with or without null children, leaves at mixed depths,
// and now and then a node whose children are all null (which is not a leaf).
inline Plain RandomTree(Rng &g, int maxNodes)
{
  Plain t;
  const bool chain = g() % 5 == 0;
  int maxDepth = chain ? 3 + static_cast<int>(g() % 10) : 1 + static_cast<int>(g() % 5);
  if (g() % 15 == 0)
    maxDepth = 0;
  const int maxFan = chain ? 1 : 2 + static_cast<int>(g() % 3);
  const int nullPercent = static_cast<int>(g() % 3) * 15;
  const int leafPercent = chain ? 5 : 10 + static_cast<int>(g() % 3) * 15;
  std::function<int(int)> grow = [&](int depth)
  {
    const int id = static_cast<int>(t.size());
    t.emplace_back();
    if (depth >= maxDepth || static_cast<int>(t.size()) >= maxNodes ||
        (depth > 0 && static_cast<int>(g() % 100) < leafPercent))
      return id;
    // The root always has a real child and a second entry, so that few walks end at the first step.
    const int fan = (depth == 0 ? 2 : 1) + static_cast<int>(g() % static_cast<unsigned>(maxFan));
    for (int i = 0; i < fan; ++i)
    {
      const bool null = (depth > 0 || i > 0) && static_cast<int>(g() % 100) < nullPercent;
      const int c = null ? -1 : grow(depth + 1);
      t[id].push_back(c);
    }
    return id;
  };
  grow(0);
  return t;
}

// A hierarchy as reached from its root: each node's parent (null for the root), in the order reached; a
// node reached twice (shared or in a cycle) is counted and not entered again.
struct Walked
{
  std::unordered_map<NodeC, NodeC> parent;
  std::vector<NodeC> order;
  int revisits = 0, nullChildren = 0;

  // -1 when n is not in the hierarchy.
  int Depth(NodeC n) const
  {
    int d = -1;
    for (auto it = parent.find(n); it != parent.end(); it = parent.find(it->second))
      ++d;
    return d;
  }
  NodeC Up(NodeC n, int levels) const
  {
    while (levels-- > 0 && n)
      n = parent.count(n) ? parent.at(n) : nullptr;
    return n;
  }
  std::vector<NodeC> Leaves() const
  {
    std::vector<NodeC> leaves;
    std::copy_if(order.begin(), order.end(), std::back_inserter(leaves), [](NodeC n) { return !n->GetNbChildren(); });
    return leaves;
  }
};

inline Walked Walk(NodeC root)
{
  Walked w;
  std::vector<std::pair<NodeC, NodeC>> stack{{root, nullptr}};
  while (!stack.empty())
  {
    const auto [n, p] = stack.back();
    stack.pop_back();
    if (!n)
      ++w.nullChildren;
    else if (!w.parent.emplace(n, p).second)
      ++w.revisits;
    else
    {
      w.order.push_back(n);
      for (int i = 1; i <= n->GetChildren().Size(); ++i)
        stack.emplace_back(n->GetChildren()[i], n);
    }
  }
  return w;
}

// Sampled points of the child must lie in the parent; an unbounded child needs an unbounded parent.
inline void ExpectEncloses(const RKMPolyBoundingVolume &parent, const RKMPolyBoundingVolume &child, Rng &g, int samples)
{
  for (int k = 0; k < samples; ++k)
  {
    const RKMMathPoint p = SampleInside(g, child);
    if (!RKMPolyBVProperties::IsPointInsideBV(parent, p))
    {
      ADD_FAILURE() << "a parent of kind " << parent.GetTypeID() << " misses (" << p.x << ", " << p.y << ", " << p.z
                    << ") inside its child of kind " << child.GetTypeID();
      return;
    }
  }
  // Sampling only reaches 20 units out.
  const auto *slab = dynamic_cast<const RKMPolyBoundingPlane *>(&child);
  const auto *cylinder = dynamic_cast<const RKMPolyBoundingCylinder *>(&child);
  if (samples == 0 || (!slab && !(cylinder && cylinder->IsInfinite())))
    return;
  const RKMMathPoint far = !slab                       ? cylinder->GetCenter() + cylinder->GetDirection() * 1e5
                           : slab->IsInfinitelyThick() ? RKMMathPoint(1e5, -1e5, 1e5)
                                                       : slab->GetOrigin() + Perpendicular(slab->GetNormal()) * 1e5;
  const RKMPolyBoundingSphere probe(far, 0.5);
  ASSERT_TRUE(RKMPolyBVBVOperations::BVOverLap(&child, &probe, 0.0, nullptr, nullptr));
  EXPECT_TRUE(RKMPolyBVBVOperations::BVOverLap(&parent, &probe, 0.0, nullptr, nullptr))
      << "a child of kind " << child.GetTypeID() << " reaches a far point its parent of kind " << parent.GetTypeID()
      << " misses";
}

// Walks the hierarchy: no node twice, no null child, and every stride-th inner node encloses its children.
inline Walked CheckHierarchy(NodeC root, Rng &g, size_t stride = 1, int samples = 8)
{
  const Walked w = Walk(root);
  EXPECT_EQ(w.revisits, 0) << "a node is reached twice";
  EXPECT_EQ(w.nullChildren, 0);
  size_t inner = 0;
  for (NodeC n : w.order)
    if (n->GetNbChildren() && inner++ % stride == 0 && n->GetFirstBoundingVolume())
      for (int i = 1; i <= n->GetNbChildren(); ++i)
        if (NodeC c = n->GetChildren()[i])
          ExpectEncloses(*n->GetFirstBoundingVolume(), *c->GetFirstBoundingVolume(), g, samples);
  return w;
}

// Starts exhausted, so a builder that forgets Begin sees nothing.
class VectorIterator : public RKMBVHNodeIterator
{
public:
  explicit VectorIterator(std::vector<RKMBVHNode *> nodes) : m_nodes(std::move(nodes)), m_pos(m_nodes.size()) {}
  RKMBVHNodeIterator &Begin() override { return m_pos = 0, *this; }
  unsigned char End() const override { return m_pos >= m_nodes.size(); }
  RKMBVHNodeIterator &operator++() override { return ++m_pos, *this; }
  RKMBVHNode *operator*() const override { return m_pos < m_nodes.size() ? m_nodes[m_pos] : nullptr; }

private:
  std::vector<RKMBVHNode *> m_nodes;
  size_t m_pos;
};

// The caller's side of a build: the entries handed to the iterator, and whatever is still the caller's
// to delete (everything until a build succeeds, the unusable entries always). Each node counts its death.
struct LeafSet
{
  std::vector<RKMBVHNode *> entries, usable, unusable;
  Journal journal;
  bool treeOwnsUsable = false;

  LeafSet() = default;
  LeafSet(const LeafSet &) = delete;
  LeafSet &operator=(const LeafSet &) = delete;
  ~LeafSet() { FreeOwned(); }
  int Deaths() const { return journal.deaths.load(); }

  RKMBVHNode *Add(RKMPolyBoundingVolume *first, RKMPolyBoundingVolume *second = nullptr)
  {
    RKMBVHNode *n = Tagged(new RKMBVHNode(first), static_cast<int>(entries.size()), &journal);
    n->SetSecondBoundingVolume(second);
    entries.push_back(n);
    (first ? usable : unusable).push_back(n);
    return n;
  }
  void FreeOwned()
  {
    for (RKMBVHNode *n : unusable)
      delete n;
    unusable.clear();
    for (RKMBVHNode *n : usable)
      if (!treeOwnsUsable)
        delete n;
    usable.resize(treeOwnsUsable ? usable.size() : 0);
  }
};

inline RKMPolyBoundingVolume *MakeVolume(Rng &g, int kind, const RKMMathPoint &c)
{
  switch (kind)
  {
  case kAABB:
    return new RKMPolyAABB(
        RKMMathBox(c, c + RKMMathVector(Uniform(g, 0.1, 3), Uniform(g, 0.1, 3), Uniform(g, 0.1, 3))));
  case kSphere:
    return new RKMPolyBoundingSphere(c, Uniform(g, 0.1, 2.5));
  case kOBB:
  {
    const RKMMath3x3Matrix R = RandomRotation(g);
    const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
    return new RKMPolyOBB(axes, RKMMathVector(Uniform(g, 0.05, 2), Uniform(g, 0.05, 2), Uniform(g, 0.05, 2)), c);
  }
  case kCapsule:
    return new RKMPolyBoundingCylinder(c, RandomUnit(g), Uniform(g, 0.1, 1.5), Uniform(g, 0.1, 2.5));
  case kSlab:
    return new RKMPolyBoundingPlane(RandomUnit(g), c, Uniform(g, 0.05, 1.5));
  default:
    return new RKMPolyBoundingCylinder(c, RandomUnit(g), Uniform(g, 0.1, 1.5), -1.0);
  }
}

// count usable leaves, a third of them crowded round one spot (deep merges, crowded grid cells), mixed
// with nulls, volumeless nodes and nodes with only a second volume, all shuffled.
inline void FillRandom(LeafSet &set, Rng &g, size_t count, bool boxesOnly, double spread)
{
  const RKMMathPoint hot = RandomPoint(g, spread);
  for (size_t i = 0; i < count; ++i)
  {
    static const int bounded[] = {kAABB, kSphere, kOBB, kCapsule};
    const double u = Uniform(g, 0, 1);
    int kind = u < 0.03 ? kSlab : u < 0.06 ? kInfiniteCylinder : bounded[i % 4];
    // Large sets always hold the unbounded kinds.
    if (count >= 17)
      kind = i == 5 ? kSlab : i == 11 ? kInfiniteCylinder : kind;
    if (boxesOnly)
      kind = kAABB;
    const RKMMathPoint c = Uniform(g, 0, 1) < 0.3 ? hot + RandomPoint(g, 1).AsVector() : RandomPoint(g, spread);
    set.Add(MakeVolume(g, kind, c));
  }
  for (size_t i = 0; !boxesOnly && i < count / 8 + 3; ++i)
  {
    if (i % 3 == 0)
      set.entries.push_back(nullptr);
    else
      set.Add(nullptr, i % 3 == 2 ? MakeVolume(g, kSphere, RKMMathPoint()) : nullptr);
  }
  std::shuffle(set.entries.begin(), set.entries.end(), g);
}
} // namespace bvhtest
