#include "BVHDescentOracle.h"
#include "RKMBVHPickingCallback.h"
#include "RKMBVHPickingOperator.h"
#include "RKMPolyBVBVOperations.h"

#include <gtest/gtest.h>

#include <cstdio>

namespace
{
using namespace bvhtest;

// Walks one tree (or the pair, when b is given) with the operator and with the reference: first without
// a stop, to learn the walk's length, then stopped somewhere inside it. Same calls, same answer.
void ExpectSameWalk(std::uint64_t seed, Rng &g, const Plain &a, const Plain *b)
{
  const auto ta = MakeTree(Build(a));
  const auto tb = b ? MakeTree(Build(*b)) : RKMRef<RKMBVHTree>();
  long stopAfter = -1;
  for (int pass = 0; pass < 2; ++pass)
  {
    Script want(seed), got(seed);
    want.stopAfter = got.stopAfter = stopAfter;
    int d1 = 0, d2 = 0;
    const HRESULT expected = b ? RefPair(a, 0, *b, 0, want, d1, d2) : RefSingle(a, 0, want, d1);
    RecordingOperator op(got);
    op.Scramble();
    EXPECT_EQ(b ? op.Descend(*ta, *tb) : op.Descend(*ta), expected) << "pass " << pass;
    EXPECT_TRUE(SameLog(want.log, got.log)) << "pass " << pass;
    EXPECT_EQ(b ? op.GetDepth1() * 100 + op.GetDepth2() : op.GetDepth(), 0) << "depths after the walk";
    stopAfter = static_cast<long>(g() % (want.log.size() + 1));
  }
}

TEST(RKMBVHDescentOperator, MatchesTheReferenceOnRandomTrees)
{
  std::printf("single descents over seeds 1..300, pair descents over seeds 1..200\n");
  for (std::uint64_t seed = 1; seed <= 300; ++seed)
  {
    SCOPED_TRACE(::testing::Message() << "single, seed " << seed);
    Rng g(seed);
    ExpectSameWalk(seed, g, RandomTree(g, 60), nullptr);
  }
  for (std::uint64_t seed = 1; seed <= 200; ++seed)
  {
    SCOPED_TRACE(::testing::Message() << "pair, seed " << seed);
    Rng g(seed * 7919);
    const Plain first = RandomTree(g, 30), second = RandomTree(g, 30);
    ExpectSameWalk(seed, g, first, &second);
  }
}

// A walk spelled out call by call (b empty: a single-tree walk); the reference must give the same log,
// so these also pin the reference.
void ExpectWalk(const Plain &a, const Plain &b, const std::function<void(Script &)> &setup, HRESULT result,
                const std::vector<std::string> &log)
{
  const auto ta = MakeTree(Build(a)), tb = MakeTree(b.empty() ? nullptr : Build(b));
  Script got(1), want(1);
  setup(got), setup(want);
  RecordingOperator op(got);
  int d1 = 0, d2 = 0;
  EXPECT_EQ(b.empty() ? op.Descend(*ta) : op.Descend(*ta, *tb), result);
  EXPECT_TRUE(SameLog(log, got.log));
  EXPECT_EQ(b.empty() ? RefSingle(a, 0, want, d1) : RefPair(a, 0, b, 0, want, d1, d2), result);
  EXPECT_TRUE(SameLog(log, want.log)) << "the reference";
}

// Every pair passes the filter; leaf pairs answer `leaf`, Choose answers `choice`.
std::function<void(Script &)> Pairs(HRESULT leaf, int choice, bool stopInLeaves = false)
{
  return [=](Script &s)
  {
    s.filter2 = [](int, int) { return true; };
    s.leaf2 = [leaf](int, int) { return leaf; };
    s.choose = [choice](int, int) { return choice; };
    s.stopInLeaves = stopInLeaves;
  };
}

TEST(RKMBVHDescentOperator, HandWrittenWalks)
{
  const Plain bushy = {{1, -1, 2}, {3, 4}, {}, {}, {}}, single = {{}}, two = {{1, 2}, {}, {}};
  {
    SCOPED_TRACE("the filter turns the root, or the roots, away");
    ExpectWalk(bushy, {}, [](Script &s) { s.filter1 = [](int) { return false; }; }, S_OK,
               {"stop?0", "filter 0 @0 ->0"});
    const std::vector<std::string> log = {"stop?0", "filter 0,0 @0,0 ->0"};
    ExpectWalk(
        bushy, bushy, [](Script &s) { s.filter2 = [](int, int) { return false; }; }, S_OK, log);
  }
  {
    SCOPED_TRACE("a failing leaf ends the single walk");
    const std::vector<std::string> log = {"stop?0", "filter 0 @0 ->1", "stop?0",          "stop?0",   "filter 1 @1 ->1",
                                          "stop?0", "stop?0",          "filter 3 @2 ->1", "leaf 3 @2"};
    const auto setup = [](Script &s)
    {
      s.filter1 = [](int) { return true; };
      s.leaf1 = [](int n) { return n == 3 ? E_FAIL : S_OK; };
    };
    ExpectWalk(bushy, {}, setup, E_FAIL, log);
  }
  {
    SCOPED_TRACE("two single nodes meet once");
    const std::vector<std::string> log = {"stop?0", "filter 0,0 @0,0 ->1", "leaves 0,0 @0,0", "end 0,0 @0,0"};
    ExpectWalk(single, single, Pairs(S_FALSE, 0), S_FALSE, log);
  }
  {
    // Choosing to open a leaf is ignored; the null child is skipped after the stop question.
    SCOPED_TRACE("a leaf opens only the other side");
    // clang-format off
    const std::vector<std::string> log = {
        "stop?0", "filter 0,0 @0,0 ->1", "choose 0,0 @0,0 ->1",
        "stop?0", "stop?0", "filter 0,1 @0,1 ->1", "choose 0,1 @0,1 ->1",
        "stop?0", "stop?0", "filter 0,3 @0,2 ->1", "leaves 0,3 @0,2", "end 0,3 @0,2",
        "stop?0", "stop?0", "filter 0,4 @0,2 ->1", "leaves 0,4 @0,2", "end 0,4 @0,2", "end 0,1 @0,1",
        "stop?0", "stop?0", "stop?0", "filter 0,2 @0,1 ->1", "leaves 0,2 @0,1", "end 0,2 @0,1", "end 0,0 @0,0"};
    ExpectWalk(single, bushy, Pairs(S_OK, 1), S_OK, log);
    const std::vector<std::string> swapped = {
        "stop?0", "filter 0,0 @0,0 ->1", "choose 0,0 @0,0 ->2",
        "stop?0", "stop?0", "filter 1,0 @1,0 ->1", "choose 1,0 @1,0 ->2",
        "stop?0", "stop?0", "filter 3,0 @2,0 ->1", "leaves 3,0 @2,0", "end 3,0 @2,0",
        "stop?0", "stop?0", "filter 4,0 @2,0 ->1", "leaves 4,0 @2,0", "end 4,0 @2,0", "end 1,0 @1,0",
        "stop?0", "stop?0", "stop?0", "filter 2,0 @1,0 ->1", "leaves 2,0 @1,0", "end 2,0 @1,0", "end 0,0 @0,0"};
    // clang-format on
    ExpectWalk(bushy, single, Pairs(S_OK, 2), S_OK, swapped);
  }
  {
    // The failed pair is the last walked, so its answer is the walk's; the outer loop asks no stop.
    SCOPED_TRACE("a stop inside a leaf pair still closes the open pairs");
    const std::vector<std::string> log = {"stop?0",
                                          "filter 0,0 @0,0 ->1",
                                          "choose 0,0 @0,0 ->0",
                                          "stop?0",
                                          "stop?0",
                                          "filter 1,1 @1,1 ->1",
                                          "leaves 1,1 @1,1",
                                          "end 1,1 @1,1",
                                          "stop?1",
                                          "stop?1",
                                          "end 0,0 @0,0"};
    ExpectWalk(two, two, Pairs(E_FAIL, 0, true), E_FAIL, log);
  }
}

TEST(RKMBVHDescentOperator, TreesWithoutRootAreRejected)
{
  const auto empty = MakeTree(nullptr), full = MakeTree(Build({{1, -1, 2}, {}, {}}));
  Script s(1);
  RecordingOperator op(s);
  op.Scramble();
  EXPECT_EQ(op.Descend(*empty), E_INVALIDARG);
  EXPECT_EQ(op.GetDepth(), 0);
  op.Scramble();
  EXPECT_EQ(op.Descend(*empty, *full), E_INVALIDARG);
  EXPECT_EQ(op.GetDepth1(), 0);
  EXPECT_EQ(op.GetDepth2(), 0);
  EXPECT_EQ(op.Descend(*full, *empty), E_INVALIDARG);
  EXPECT_TRUE(s.log.empty());
}

// Filters on the first volumes as a collision query would, and reports the leaf pairs it reaches.
class OverlapOperator : public RKMBVHDescentOperator
{
public:
  std::vector<std::pair<int, int>> hits;

protected:
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return RKMPolyBVBVOperations::BVOverLap(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(), 0.0, nullptr,
                                            nullptr);
  }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    hits.emplace_back(IdOf(a), IdOf(b));
    return S_OK;
  }
};

TEST(RKMBVHDescentOperator, UnboundedLeafIsNeverPrunedByItsAncestors)
{
  // The cylinder runs along x through (0, 100, 100): it meets the other tree's box near x = 1000,
  // which no bounded ancestor built from the unit boxes below would.
  const auto leaf = [](int id, RKMPolyBoundingVolume *bv) { return Tagged(new RKMBVHNode(bv), id); };
  const auto box = [](float x) { return new RKMPolyAABB(RKMPolyBoxf(x, x + 1, 0.f, 1.f, 0.f, 1.f)); };
  RKMBVHNode *mid = leaf(1, box(0)), *root = leaf(0, box(2));
  ASSERT_TRUE(SUCCEEDED(mid->AbsorbChild(leaf(3, box(0)))));
  ASSERT_TRUE(SUCCEEDED(mid->AbsorbChild(
      leaf(4, new RKMPolyBoundingCylinder(RKMMathPoint(0, 100, 100), RKMMathVector(1, 0, 0), 1.0, -1.0)))));
  ASSERT_TRUE(SUCCEEDED(root->AbsorbChild(leaf(2, box(2)))));
  ASSERT_TRUE(SUCCEEDED(root->AbsorbChild(mid)));
  const auto withCylinder = MakeTree(root);
  const std::vector<RKMPolyBoundingVolume *> farVolumes = {
      new RKMPolyAABB(RKMPolyBoxf(999.f, 1001.f, 99.f, 101.f, 99.f, 101.f)),
      new RKMPolyBoundingSphere(RKMMathPoint(-5000, 100, 101.5), 1.0)};
  for (RKMPolyBoundingVolume *bv : farVolumes)
  {
    SCOPED_TRACE(bv->GetTypeID());
    const auto far = MakeTree(leaf(0, bv));
    OverlapOperator op;
    EXPECT_EQ(op.Descend(*withCylinder, *far), S_OK);
    EXPECT_EQ(op.hits, (std::vector<std::pair<int, int>>{{4, 0}}));
    op.hits.clear();
    EXPECT_EQ(op.Descend(*far, *withCylinder), S_OK);
    EXPECT_EQ(op.hits, (std::vector<std::pair<int, int>>{{0, 4}}));
  }
}

class SilentCallback : public RKMBVHPickingCallback
{
public:
  int calls = 0;
  HRESULT OnCandidate(const RKMBVHNodeConst &) override { return ++calls, S_OK; }
  HRESULT OnHit(const RKMBVHNodeConst &, double) override { return ++calls, S_OK; }
  void OnEnd() override { ++calls; }
};

TEST(RKMBVHPickingOperator, RunReportsFailureWithoutCallingBack)
{
  const auto t = MakeTree(Build({{1, 2}, {}, {}}));
  SilentCallback cb;
  RKMBVHPickingOperator picking(cb, 0.25);
  EXPECT_EQ(picking.Run(*t, RKMMathPoint(0, 0, 0), RKMMathVector(1, 0, 0)), E_FAIL);
  EXPECT_EQ(cb.calls, 0);
}
} // namespace
