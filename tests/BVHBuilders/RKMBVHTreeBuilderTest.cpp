#include "RKMBVHTreeBuilder.h"
#include "BVHTestTrees.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <limits>
#include <tuple>
#include <unordered_set>

namespace
{
using namespace bvhtest;
using Builder = RKMBVHTreeBuilder;
using Strategy = RKMBVHTreeBuilder::SpatialOptimization;

constexpr Strategy kStrategies[] = {Builder::NoOptim, Builder::Basic, Builder::Best};
const char *const kStrategyNames[] = {"NoOptim", "Basic", "Best"};
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

// Never dereferenced: lets a test see that a failing Run did not write the output, not even a null.
RKMBVHTree *const kUntouched = reinterpret_cast<RKMBVHTree *>(std::uintptr_t{0x40});

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

// Every usable leaf once and unchanged, no unusable entry, inner nodes with a volume and (under Basic)
// two children at least; enclosure only on every stride-th inner node (none with 0 samples).
Walked CheckTree(const LeafSet &set, NodeC root, Strategy s, Rng &g, size_t stride, int samples)
{
  EXPECT_NE(root, nullptr);
  if (!root)
    return {};
  const std::unordered_set<NodeC> usable(set.usable.begin(), set.usable.end());
  const std::unordered_set<NodeC> unusable(set.unusable.begin(), set.unusable.end());
  const Walked w = CheckHierarchy(root, g, stride, samples);
  size_t leaves = 0;
  for (NodeC n : w.order)
    if (usable.count(n) && ++leaves)
      EXPECT_EQ(n->GetNbChildren(), 0) << "a leaf gained children";
    else
    {
      EXPECT_EQ(unusable.count(n), 0u) << "an unusable entry is in the tree";
      EXPECT_GE(n->GetNbChildren(), s == Builder::Basic ? 2 : 1);
      EXPECT_NE(n->GetFirstBoundingVolume(), nullptr);
    }
  EXPECT_EQ(leaves, set.usable.size()) << "usable leaves missing from the tree";
  return w;
}

HRESULT Build(Strategy s, LeafSet &set, RKMBVHTree *&tree)
{
  VectorIterator it(set.entries);
  tree = kUntouched;
  const HRESULT hr = Builder(s).Run(it, tree);
  set.treeOwnsUsable = hr == S_OK;
  return hr;
}

class RKMBVHTreeBuilderRandom : public ::testing::TestWithParam<std::tuple<Strategy, size_t>>
{
};

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
    ASSERT_EQ(Build(s, set, tree), S_OK);
    ASSERT_TRUE(tree != kUntouched && tree);
    EXPECT_EQ(tree->GetRefCount(), 1);
    NodeC root = tree->GetRoot();
    // One leaf is the root itself; two, or any number under NoOptim, sit right under the root.
    if (count <= 2 || s == Builder::NoOptim)
    {
      EXPECT_TRUE(count == 1 ? root == set.usable[0] : root->GetNbChildren() == static_cast<int>(count));
    }
    CheckTree(set, root, s, g, 1, 8);
    EXPECT_TRUE(States(set.usable) == before) << "the build changed a leaf";
    EXPECT_EQ(set.Deaths(), 0);
    EXPECT_EQ(tree->Release(), 0);
    EXPECT_EQ(set.Deaths(), static_cast<int>(count)) << "Release must delete exactly the leaves it was given";
  }
}

INSTANTIATE_TEST_SUITE_P(
    AllStrategies, RKMBVHTreeBuilderRandom,
    ::testing::Combine(::testing::ValuesIn(kStrategies), ::testing::Values<size_t>(1, 2, 3, 17, 1000)),
    [](const auto &info)
    { return std::string(kStrategyNames[std::get<0>(info.param)]) + "_" + std::to_string(std::get<1>(info.param)); });

TEST(RKMBVHTreeBuilder, BasicHandlesAHundredThousandBoxes)
{
  Rng g(100000);
  LeafSet set;
  FillRandom(set, g, 100000, true, 200.0);
  RKMBVHTree *tree;
  ASSERT_EQ(Build(Builder::Basic, set, tree), S_OK);
  CheckTree(set, tree->GetRoot(), Builder::Basic, g, 13, 2);
  EXPECT_EQ(tree->Release(), 0);
  EXPECT_EQ(set.Deaths(), 100000);
}

// Most leaves crowd around one point (as a detailed part of a mesh does in the grid of the whole):
// their cells are gridded again, so no node ends with hundreds of children for a pair walk to test
// against each other, and coincident centres still end in one flat node.
TEST(RKMBVHTreeBuilder, BasicGridsCrowdedCellsAgain)
{
  Rng g(4242);
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
  int widest = 0, flat40 = 0;
  for (NodeC n : CheckTree(set, tree->GetRoot(), Builder::Basic, g, 97, 2).order)
  {
    widest = std::max(widest, n->GetNbChildren() == 40 ? 0 : n->GetNbChildren());
    flat40 += n->GetNbChildren() == 40;
  }
  EXPECT_LE(widest, 16);
  EXPECT_EQ(flat40, 1);
  EXPECT_EQ(tree->Release(), 0);
}

// Nothing usable (a second volume alone does not make a leaf usable), or an unknown strategy.
TEST(RKMBVHTreeBuilder, FailureLeavesTreeAndLeavesToTheCaller)
{
  for (int s : {0, 1, 2, 3})
  {
    SCOPED_TRACE("strategy " + std::to_string(s));
    RKMBVHTree *tree = kUntouched;
    VectorIterator empty({});
    EXPECT_EQ(Builder(static_cast<Strategy>(s)).Run(empty, tree), s < 3 ? E_INVALIDARG : E_NOTIMPL);
    EXPECT_EQ(tree, kUntouched);
    Rng g(3);
    LeafSet set;
    set.entries.push_back(nullptr);
    set.Add(nullptr);
    set.Add(nullptr, new RKMPolyBoundingSphere(RKMMathPoint(1, 2, 3), 1.0));
    for (int kind : {kAABB, kSphere, kOBB})
      if (s == 3)
        set.Add(MakeVolume(g, kind, RandomPoint(g, 5)));
    const std::vector<LeafState> before = States(set.usable);
    EXPECT_EQ(Build(static_cast<Strategy>(s), set, tree), s < 3 ? E_INVALIDARG : E_NOTIMPL);
    EXPECT_EQ(tree, kUntouched);
    EXPECT_EQ(set.Deaths(), 0);
    EXPECT_TRUE(States(set.usable) == before);
    set.FreeOwned();
    EXPECT_EQ(set.Deaths(), s < 3 ? 2 : 5);
  }
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
    EXPECT_EQ(w.Depth(leaf), 1);
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
    const Walked w = CheckTree(set, tree->GetRoot(), Builder::Basic, g, 1, 8);
    ASSERT_EQ(w.order.size(), 31u);
    for (NodeC n : w.order)
      EXPECT_TRUE(n->GetNbChildren() == 0 || n->GetNbChildren() == 2);
    for (int k = 0; k < 16; ++k)
    {
      EXPECT_EQ(w.Depth(byX[k]), 4) << "leaf " << k;
      for (int up = 1; up <= 4; ++up)
        EXPECT_EQ(w.Up(byX[k], up), w.Up(byX[k & ~((1 << up) - 1)], up)) << "leaf " << k << " up " << up;
    }
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
    EXPECT_EQ(set.Deaths(), 14);
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
    EXPECT_EQ(w.Depth(leaf[0]), 2);
    EXPECT_EQ(tree->GetRoot()->GetNbChildren(), 2);
    EXPECT_EQ(tree->Release(), 0);
  } while (std::next_permutation(order, order + 3));
}
} // namespace
