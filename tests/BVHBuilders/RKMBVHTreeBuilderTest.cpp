#include "RKMBVHAttribute.h"
#include "RKMBVHNode.h"
#include "RKMBVHNodeIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeBuilder.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVProperties.h"

#include "../PolyMathBV/RKMPolyBVTestUtil.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <limits>
#include <string>
#include <tuple>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace
{
using namespace bvtest;
using Builder = RKMBVHTreeBuilder;
using Strategy = RKMBVHTreeBuilder::SpatialOptimization;
using NodeC = const RKMBVHNodeConst *;

constexpr Strategy kStrategies[] = {Builder::NoOptim, Builder::Basic, Builder::Best};
const char *const kStrategyNames[] = {"NoOptim", "Basic", "Best"};
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

// Never dereferenced: lets a test see that a failing Run did not write the output, not even a null.
RKMBVHTree *const kUntouched = reinterpret_cast<RKMBVHTree *>(std::uintptr_t{0x40});

// Each node carries one: a leaf deleted twice or never shows in the count (and under AddressSanitizer
// as an error or a leak).
struct DeathCount : RKMBVHAttribute
{
  explicit DeathCount(int *count) : count(count) {}
  ~DeathCount() override { ++*count; }
  int *count;
};

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

// The caller's side of a build: the entries handed to the iterator and whatever is still the caller's
// to delete (everything until a Run succeeds, the unusable entries always).
struct LeafSet
{
  std::vector<RKMBVHNode *> entries, usable, unusable;
  int deaths = 0;
  bool treeOwnsUsable = false;

  LeafSet() = default;
  LeafSet(const LeafSet &) = delete;
  LeafSet &operator=(const LeafSet &) = delete;
  ~LeafSet() { FreeOwned(); }

  RKMBVHNode *Add(RKMPolyBoundingVolume *first, RKMPolyBoundingVolume *second = nullptr)
  {
    RKMBVHNode *n = new RKMBVHNode(first);
    n->SetSecondBoundingVolume(second);
    n->SetAttribute(new DeathCount(&deaths));
    entries.push_back(n);
    (first ? usable : unusable).push_back(n);
    return n;
  }
  void AddNull() { entries.push_back(nullptr); }
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

RKMPolyBoundingVolume *MakeVolume(Rng &g, int kind, const RKMMathPoint &c)
{
  switch (kind)
  {
  case kAABB:
    return new RKMPolyAABB(RKMMathBox(c, c + RKMMathVector(Uniform(g, 0.1, 3), Uniform(g, 0.1, 3), Uniform(g, 0.1, 3))));
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
void FillRandom(LeafSet &set, Rng &g, size_t count, bool boxesOnly, double spread)
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
      set.AddNull();
    else
      set.Add(nullptr, i % 3 == 2 ? MakeVolume(g, kSphere, RKMMathPoint()) : nullptr);
  }
  std::shuffle(set.entries.begin(), set.entries.end(), g);
}

// A leaf as the build could alter it: its volume pointers and its first volume byte for byte, so a
// change shows even where no getter looks (and a NaN compares equal to itself).
using LeafState = std::tuple<const void *, const void *, std::string>;

std::vector<LeafState> States(const std::vector<RKMBVHNode *> &leaves)
{
  static const size_t sizes[] = {sizeof(RKMPolyAABB), sizeof(RKMPolyBoundingSphere), sizeof(RKMPolyOBB),
                                 sizeof(RKMPolyBoundingPlane), sizeof(RKMPolyBoundingCylinder)};
  std::vector<LeafState> states;
  for (const RKMBVHNode *n : leaves)
  {
    const RKMPolyBoundingVolume *bv = n->GetFirstBoundingVolume();
    states.emplace_back(bv, n->GetSecondBoundingVolume(),
                        std::string(reinterpret_cast<const char *>(bv), sizes[bv->GetTypeID()]));
  }
  return states;
}

// The hierarchy as reached from the root: each node's parent (null for the root); a node reached twice (shared
// or in a cycle) is counted and not entered again.
struct Walked
{
  std::unordered_map<NodeC, NodeC> parent;
  std::vector<NodeC> order;
  int revisits = 0, nullChildren = 0;
};

Walked Walk(NodeC root)
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

// -1 when n is not in the hierarchy.
int DepthOf(const Walked &w, NodeC n)
{
  int d = -1;
  for (auto it = w.parent.find(n); it != w.parent.end(); it = w.parent.find(it->second))
    ++d;
  return d;
}

void ExpectEncloses(const RKMPolyBoundingVolume &parent, const RKMPolyBoundingVolume &child, Rng &g, int samples)
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
  // Sampling only reaches 20 units out; an unbounded child needs an unbounded parent.
  const auto *slab = dynamic_cast<const RKMPolyBoundingPlane *>(&child);
  const auto *cylinder = dynamic_cast<const RKMPolyBoundingCylinder *>(&child);
  if (samples == 0 || (!slab && !(cylinder && cylinder->IsInfinite())))
    return;
  const RKMMathPoint far = !slab ? cylinder->GetCenter() + cylinder->GetDirection() * 1e5
                           : slab->IsInfinitelyThick() ? RKMMathPoint(1e5, -1e5, 1e5)
                                                       : slab->GetOrigin() + Perpendicular(slab->GetNormal()) * 1e5;
  const RKMPolyBoundingSphere probe(far, 0.5);
  ASSERT_TRUE(RKMPolyBVBVOperations::BVOverLap(&child, &probe, 0.0, nullptr, nullptr));
  EXPECT_TRUE(RKMPolyBVBVOperations::BVOverLap(&parent, &probe, 0.0, nullptr, nullptr))
      << "a child of kind " << child.GetTypeID() << " reaches a far point its parent of kind " << parent.GetTypeID()
      << " misses";
}

// Checks every node of the hierarchy; enclosure only on every stride-th inner node (none with 0 samples).
void CheckTree(const LeafSet &set, NodeC root, Strategy s, Rng &g, size_t stride, int samples)
{
  ASSERT_NE(root, nullptr);
  const std::unordered_set<NodeC> usable(set.usable.begin(), set.usable.end());
  const std::unordered_set<NodeC> unusable(set.unusable.begin(), set.unusable.end());
  const Walked w = Walk(root);
  EXPECT_EQ(w.revisits, 0) << "a node is reached twice";
  EXPECT_EQ(w.nullChildren, 0);
  size_t leaves = 0, inner = 0;
  for (NodeC n : w.order)
  {
    const int nb = n->GetNbChildren();
    if (usable.count(n))
    {
      ++leaves;
      EXPECT_EQ(nb, 0) << "a leaf gained children";
      continue;
    }
    EXPECT_EQ(unusable.count(n), 0u) << "an unusable entry is in the tree";
    EXPECT_GE(nb, s == Builder::Basic ? 2 : 1);
    ASSERT_NE(n->GetFirstBoundingVolume(), nullptr);
    if (inner++ % stride == 0)
      for (int i = 1; i <= nb; ++i)
        if (NodeC c = n->GetChildren()[i])
          ExpectEncloses(*n->GetFirstBoundingVolume(), *c->GetFirstBoundingVolume(), g, samples);
  }
  EXPECT_EQ(leaves, set.usable.size()) << "usable leaves missing from the tree";
}

HRESULT Build(Strategy s, LeafSet &set, RKMBVHTree *&tree)
{
  VectorIterator it(set.entries);
  tree = kUntouched;
  const HRESULT hr = Builder(s).Run(it, tree);
  set.treeOwnsUsable = hr == S_OK;
  return hr;
}

class RKMBVHTreeBuilderRandom : public ::testing::TestWithParam<std::tuple<Strategy, size_t>> {};

TEST_P(RKMBVHTreeBuilderRandom, EveryUsableLeafOnceUnderEnclosingParents)
{
  const auto [s, count] = GetParam();
  for (std::uint64_t seed = 0; seed < (count >= 1000 ? 1u : 4u); ++seed)
  {
    const std::uint64_t fullSeed = 0x7e57 + 1000 * seed + 10 * count + s;
    SCOPED_TRACE(std::string(kStrategyNames[s]) + ", " + std::to_string(count) + " leaves, seed " +
                 std::to_string(fullSeed));
    Rng g(fullSeed);
    LeafSet set;
    FillRandom(set, g, count, false, 40.0);
    const std::vector<LeafState> before = States(set.usable);
    RKMBVHTree *tree;
    const HRESULT hr = Build(s, set, tree);
    if (count == 0)
    {
      EXPECT_EQ(hr, E_INVALIDARG);
      EXPECT_EQ(tree, kUntouched);
      EXPECT_EQ(set.deaths, 0);
      continue;
    }
    ASSERT_EQ(hr, S_OK);
    ASSERT_TRUE(tree != kUntouched && tree);
    EXPECT_EQ(tree->GetRefCount(), 1);
    NodeC root = tree->GetRoot();
    // One leaf is the root itself; two, or any number under NoOptim, sit right under the root.
    if (count == 1)
    {
      EXPECT_EQ(root, set.usable[0]);
    }
    else if (count == 2 || s == Builder::NoOptim)
    {
      EXPECT_EQ(root->GetNbChildren(), static_cast<int>(count));
    }
    CheckTree(set, root, s, g, 1, 8);
    EXPECT_TRUE(States(set.usable) == before) << "the build changed a leaf";
    EXPECT_EQ(set.deaths, 0);
    EXPECT_EQ(tree->Release(), 0);
    EXPECT_EQ(set.deaths, static_cast<int>(count)) << "Release must delete exactly the leaves it was given";
  }
}

INSTANTIATE_TEST_SUITE_P(AllStrategies, RKMBVHTreeBuilderRandom,
                         ::testing::Combine(::testing::ValuesIn(kStrategies),
                                            ::testing::Values<size_t>(0, 1, 2, 3, 17, 1000)),
                         [](const auto &info) {
                           return std::string(kStrategyNames[std::get<0>(info.param)]) + "_" +
                                  std::to_string(std::get<1>(info.param));
                         });

TEST(RKMBVHTreeBuilder, BasicHandlesAHundredThousandBoxes)
{
  const std::uint64_t seed = 100000;
  SCOPED_TRACE("seed " + std::to_string(seed));
  Rng g(seed);
  LeafSet set;
  FillRandom(set, g, 100000, true, 200.0);
  RKMBVHTree *tree;
  ASSERT_EQ(Build(Builder::Basic, set, tree), S_OK);
  CheckTree(set, tree->GetRoot(), Builder::Basic, g, 13, 2);
  EXPECT_EQ(tree->Release(), 0);
  EXPECT_EQ(set.deaths, 100000);
}

// Most leaves crowd around one point (as a detailed part of a mesh does in the grid of the whole):
// their cells are gridded again, so no node ends with hundreds of children for a pair walk to test
// against each other, and coincident centres still end in one flat node.
TEST(RKMBVHTreeBuilder, BasicGridsCrowdedCellsAgain)
{
  const std::uint64_t seed = 4242;
  SCOPED_TRACE("seed " + std::to_string(seed));
  Rng g(seed);
  LeafSet set;
  FillRandom(set, g, 20000, true, 1000.0);
  for (int i = 0; i < 20000; ++i)
  {
    const RKMMathPoint c = RandomPoint(g, 0.5);
    set.Add(new RKMPolyAABB(RKMMathBox(c, c + RKMMathVector(0.01, 0.01, 0.01))));
  }
  for (int i = 0; i < 40; ++i)
    set.Add(new RKMPolyAABB(RKMMathBox(RKMMathPoint(7, 7, 7), RKMMathPoint(8, 8, 8))));
  RKMBVHTree *tree;
  ASSERT_EQ(Build(Builder::Basic, set, tree), S_OK);
  CheckTree(set, tree->GetRoot(), Builder::Basic, g, 97, 2);
  int widest = 0, flat40 = 0;
  for (NodeC n : Walk(tree->GetRoot()).order)
  {
    widest = std::max(widest, n->GetNbChildren() == 40 ? 0 : n->GetNbChildren());
    flat40 += n->GetNbChildren() == 40;
  }
  EXPECT_LE(widest, 16);
  EXPECT_EQ(flat40, 1);
  EXPECT_EQ(tree->Release(), 0);
}

TEST(RKMBVHTreeBuilder, FailureLeavesTreeAndLeavesToTheCaller)
{
  for (Strategy s : kStrategies)
  {
    SCOPED_TRACE(kStrategyNames[s]);
    VectorIterator empty({});
    RKMBVHTree *tree = kUntouched;
    EXPECT_EQ(Builder(s).Run(empty, tree), E_INVALIDARG);
    EXPECT_EQ(tree, kUntouched);

    // A second volume alone does not make a leaf usable.
    LeafSet set;
    set.AddNull();
    set.Add(nullptr);
    set.Add(nullptr, new RKMPolyBoundingSphere(RKMMathPoint(1, 2, 3), 1.0));
    set.AddNull();
    EXPECT_EQ(Build(s, set, tree), E_INVALIDARG);
    EXPECT_EQ(tree, kUntouched);
    EXPECT_EQ(set.deaths, 0);
    set.FreeOwned();
    EXPECT_EQ(set.deaths, 2);
  }
  LeafSet set;
  Rng g(3);
  for (int kind : {kAABB, kSphere, kOBB})
    set.Add(MakeVolume(g, kind, RandomPoint(g, 5)));
  const std::vector<LeafState> before = States(set.usable);
  RKMBVHTree *tree;
  EXPECT_EQ(Build(static_cast<Strategy>(3), set, tree), E_NOTIMPL);
  EXPECT_EQ(tree, kUntouched);
  EXPECT_EQ(set.deaths, 0);
  EXPECT_TRUE(States(set.usable) == before);
  set.FreeOwned();
  EXPECT_EQ(set.deaths, 3);
}

TEST(RKMBVHTreeBuilder, BasicPutsCoincidentCentresInOneNode)
{
  LeafSet set;
  // A box rounds its limits outward, so the others take the box's own centre.
  const RKMMathPoint c = RKMPolyBVProperties::GetCenter(
      set.Add(new RKMPolyAABB(RKMMathBox(RKMMathPoint(2, -2, 2), RKMMathPoint(3, 0, 6))))->GetFirstBoundingVolume());
  set.Add(new RKMPolyBoundingSphere(c, 3.0));
  set.Add(new RKMPolyBoundingCylinder(c, RKMMathVector(0, 1, 1), 0.5, 2.0));
  RKMBVHTree *tree;
  ASSERT_EQ(Build(Builder::Basic, set, tree), S_OK);
  const Walked w = Walk(tree->GetRoot());
  EXPECT_EQ(tree->GetRoot()->GetNbChildren(), 3);
  for (NodeC leaf : set.usable)
    EXPECT_EQ(DepthOf(w, leaf), 1);
  EXPECT_EQ(tree->Release(), 0);
}

// Sixteen centres evenly spaced along x fill the sixteen cells of one grid row, so the 2 × 2 × 2
// reduction must pair cells 2j and 2j + 1, then blocks of four, and so on: a perfect binary tree. At
// 1e17 any padding of the limits is lost to rounding and the highest centre sits on the upper limit.
TEST(RKMBVHTreeBuilder, BasicBinsAnXSpreadFromFirstToLastCell)
{
  for (double span : {1.0, 1000.0, 1e17})
  {
    SCOPED_TRACE("span " + std::to_string(span));
    LeafSet set;
    for (int k = 0; k < 16; ++k)
      set.Add(new RKMPolyBoundingSphere(RKMMathPoint(-7 + span * k / 15, 3, 2), 0.01));
    const std::vector<RKMBVHNode *> byX = set.usable;
    Rng g(16);
    std::shuffle(set.entries.begin(), set.entries.end(), g);
    RKMBVHTree *tree;
    ASSERT_EQ(Build(Builder::Basic, set, tree), S_OK);
    const Walked w = Walk(tree->GetRoot());
    ASSERT_EQ(w.order.size(), 31u);
    for (NodeC n : w.order)
      EXPECT_TRUE(n->GetNbChildren() == 0 || n->GetNbChildren() == 2);
    auto up = [&w](NodeC n, int levels) {
      while (levels-- > 0 && n)
        n = w.parent.count(n) ? w.parent.at(n) : nullptr;
      return n;
    };
    for (int k = 0; k < 16; ++k)
    {
      EXPECT_EQ(DepthOf(w, byX[k]), 4) << "leaf " << k;
      for (int levels = 1; levels <= 4; ++levels)
        EXPECT_EQ(up(byX[k], levels), up(byX[k & ~((1 << levels) - 1)], levels)) << "leaf " << k << " up " << levels;
    }
    CheckTree(set, tree->GetRoot(), Builder::Basic, g, 1, 8);
    EXPECT_EQ(tree->Release(), 0);
  }
}

TEST(RKMBVHTreeBuilder, NaNCentreStillGivesItsLeafOnce)
{
  for (Strategy s : kStrategies)
  {
    SCOPED_TRACE(kStrategyNames[s]);
    Rng g(29);
    LeafSet set;
    set.Add(new RKMPolyBoundingSphere(RKMMathPoint(kNaN, 1, 2), 1.0));
    for (int k = 0; k < 12; ++k)
      set.Add(MakeVolume(g, k % 2 ? kSphere : kAABB, RandomPoint(g, 10)));
    set.Add(new RKMPolyBoundingSphere(RKMMathPoint(3, kNaN, 0), 1.0));
    RKMBVHTree *tree;
    ASSERT_EQ(Build(s, set, tree), S_OK);
    // Enclosure means nothing next to a NaN; only the shape is checked.
    CheckTree(set, tree->GetRoot(), s, g, 1, 0);
    EXPECT_EQ(tree->Release(), 0);
    EXPECT_EQ(set.deaths, 14);
  }
}

TEST(RKMBVHTreeBuilder, BestPairsTheCloseLeavesBeforeTheFarOne)
{
  int order[3] = {0, 1, 2};
  do
  {
    SCOPED_TRACE("input order " + std::to_string(order[0]) + std::to_string(order[1]) + std::to_string(order[2]));
    const RKMMathPoint centres[3] = {{0, 0, 0}, {1.5, 0, 0}, {100, 0, 0}};
    LeafSet set;
    RKMBVHNode *leaf[3];
    for (int i : order)
      leaf[i] = set.Add(new RKMPolyBoundingSphere(centres[i], 1.0));
    RKMBVHTree *tree;
    ASSERT_EQ(Build(Builder::Best, set, tree), S_OK);
    const Walked w = Walk(tree->GetRoot());
    ASSERT_EQ(w.order.size(), 5u);
    EXPECT_EQ(w.parent.at(leaf[2]), tree->GetRoot());
    EXPECT_EQ(w.parent.at(leaf[0]), w.parent.at(leaf[1]));
    EXPECT_EQ(DepthOf(w, leaf[0]), 2);
    EXPECT_EQ(tree->GetRoot()->GetNbChildren(), 2);
    EXPECT_EQ(tree->Release(), 0);
  } while (std::next_permutation(order, order + 3));
}
}
