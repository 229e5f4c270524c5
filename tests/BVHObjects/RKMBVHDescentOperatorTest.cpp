#include "RKMBVHAttribute.h"
#include "RKMBVHDescentOperator.h"
#include "RKMBVHNode.h"
#include "RKMBVHPickingCallback.h"
#include "RKMBVHPickingOperator.h"
#include "RKMBVHTree.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMRef.h"

#include "RKMMathPoint.h"
#include "RKMMathVector.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <functional>
#include <random>
#include <string>
#include <vector>

namespace
{
struct IdAttr : RKMBVHAttribute
{
  explicit IdAttr(int i) : id(i) {}
  int id;
};

int Id(const RKMBVHNodeConst &n) { return static_cast<const IdAttr *>(n.GetAttribute())->id; }

std::uint64_t Mix(std::uint64_t x)
{
  x += 0x9e3779b97f4a7c15ull;
  x = (x ^ (x >> 30)) * 0xbf58476d1ce4e5b9ull;
  x = (x ^ (x >> 27)) * 0x94d049bb133111ebull;
  return x ^ (x >> 31);
}

std::uint64_t Hash(std::uint64_t seed, int tag, int a, int b = 0)
{
  return Mix(Mix(Mix(seed ^ static_cast<std::uint64_t>(tag)) + static_cast<std::uint64_t>(a)) +
             static_cast<std::uint64_t>(b));
}

// The answers of every hook and the log of the calls, shared by the operator under test and by the
// reference walk below, so that both see the same answers as long as they make the same calls.
struct Script
{
  explicit Script(std::uint64_t seed)
  {
    filter1 = [seed](int n) { return Hash(seed, 1, n) % 10 != 0; };
    leaf1 = [seed](int n) {
      const std::uint64_t h = Hash(seed, 2, n) % 5;
      return h == 0 ? E_FAIL : (h == 1 ? S_FALSE : S_OK);
    };
    filter2 = [seed](int a, int b) { return Hash(seed, 3, a, b) % 12 != 0; };
    choose = [seed](int a, int b) { return static_cast<int>(Hash(seed, 4, a, b) % 4); };
    leaf2 = [seed](int a, int b) {
      const std::uint64_t h = Hash(seed, 5, a, b) % 4;
      return h == 0 ? E_FAIL : (h == 1 ? S_FALSE : S_OK);
    };
  }

  // True once stopAfter hook calls have been made (never when negative), or once a hook set stopped.
  bool Stopped()
  {
    const bool r = stopped || (stopAfter >= 0 && static_cast<long>(log.size()) >= stopAfter);
    log.push_back(r ? "stop?1" : "stop?0");
    return r;
  }
  bool Filter1(int n, int d)
  {
    const bool r = filter1(n);
    log.push_back("filter " + std::to_string(n) + " @" + std::to_string(d) + " ->" + std::to_string(r));
    return r;
  }
  HRESULT Leaf1(int n, int d)
  {
    log.push_back("leaf " + std::to_string(n) + " @" + std::to_string(d));
    return leaf1(n);
  }
  static std::string Pair(int a, int b, int d1, int d2)
  {
    return std::to_string(a) + "," + std::to_string(b) + " @" + std::to_string(d1) + "," + std::to_string(d2);
  }
  bool Filter2(int a, int b, int d1, int d2)
  {
    const bool r = filter2(a, b);
    log.push_back("filter " + Pair(a, b, d1, d2) + " ->" + std::to_string(r));
    return r;
  }
  int Choose(int a, int b, int d1, int d2)
  {
    const int r = choose(a, b);
    log.push_back("choose " + Pair(a, b, d1, d2) + " ->" + std::to_string(r));
    return r;
  }
  HRESULT Leaf2(int a, int b, int d1, int d2)
  {
    log.push_back("leaves " + Pair(a, b, d1, d2));
    stopped = stopped || stopInLeaves;
    return leaf2(a, b);
  }
  void End(int a, int b, int d1, int d2) { log.push_back("end " + Pair(a, b, d1, d2)); }

  std::function<bool(int)> filter1;
  std::function<HRESULT(int)> leaf1;
  std::function<bool(int, int)> filter2;
  std::function<int(int, int)> choose;
  std::function<HRESULT(int, int)> leaf2;
  long stopAfter = -1;
  bool stopInLeaves = false;
  bool stopped = false;
  std::vector<std::string> log;
};

class RecordingOperator : public RKMBVHDescentOperator
{
public:
  explicit RecordingOperator(Script &s) : m_s(s) {}
  // Garbage in the counters: the public entry points must reset them.
  void Scramble()
  {
    depth = 77;
    depth1 = 88;
    depth2 = 99;
  }

protected:
  unsigned char Filter(RKMBVHNodeConst &n) override { return m_s.Filter1(Id(n), depth); }
  HRESULT ProcessLeafNode(RKMBVHNodeConst &n) override { return m_s.Leaf1(Id(n), depth); }
  unsigned char IsStopped() override { return m_s.Stopped(); }
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return m_s.Filter2(Id(a), Id(b), depth1, depth2);
  }
  int Choose(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override { return m_s.Choose(Id(a), Id(b), depth1, depth2); }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return m_s.Leaf2(Id(a), Id(b), depth1, depth2);
  }
  void End(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override { m_s.End(Id(a), Id(b), depth1, depth2); }

private:
  Script &m_s;
};

// A plain tree: kids[n] lists the children of node n in order, -1 standing for a null child; node 0 is
// the root.
struct Plain
{
  std::vector<std::vector<int>> kids;
};

HRESULT RefSingle(const Plain &t, int n, Script &s, int &depth)
{
  if (s.Stopped() || !s.Filter1(n, depth))
    return S_OK;
  if (t.kids[n].empty())
    return s.Leaf1(n, depth);
  HRESULT r = S_OK;
  for (int c : t.kids[n])
  {
    if (s.Stopped())
      break;
    if (c < 0)
      continue;
    ++depth;
    r = RefSingle(t, c, s, depth);
    --depth;
    if (FAILED(r))
      break;
  }
  return r;
}

HRESULT RefPair(const Plain &A, int a, const Plain &B, int b, Script &s, int &d1, int &d2)
{
  if (s.Stopped() || !s.Filter2(a, b, d1, d2))
    return S_OK;
  const bool leafA = A.kids[a].empty(), leafB = B.kids[b].empty();
  if (leafA && leafB)
  {
    const HRESULT r = s.Leaf2(a, b, d1, d2);
    s.End(a, b, d1, d2);
    return r;
  }
  const int choice = s.Choose(a, b, d1, d2);
  HRESULT r = S_OK;
  const bool openA = !leafA && (leafB || choice == 1);
  const bool openB = !leafB && (leafA || choice == 2);
  if (openA)
    for (int c : A.kids[a])
    {
      if (s.Stopped())
        break;
      if (c < 0)
        continue;
      ++d1;
      r = RefPair(A, c, B, b, s, d1, d2);
      --d1;
    }
  else if (openB)
    for (int c : B.kids[b])
    {
      if (s.Stopped())
        break;
      if (c < 0)
        continue;
      ++d2;
      r = RefPair(A, a, B, c, s, d1, d2);
      --d2;
    }
  else
    for (int ca : A.kids[a])
    {
      if (ca < 0)
        continue;
      for (int cb : B.kids[b])
      {
        if (s.Stopped())
          break;
        if (cb < 0)
          continue;
        ++d1, ++d2;
        r = RefPair(A, ca, B, cb, s, d1, d2);
        --d1, --d2;
      }
    }
  s.End(a, b, d1, d2);
  return r;
}

RKMBVHNode *Build(const Plain &t, int n)
{
  RKMBVHNode *node = new RKMBVHNode;
  node->SetAttribute(new IdAttr(n));
  for (int c : t.kids[n])
    node->AddChild(c < 0 ? nullptr : Build(t, c));
  return node;
}

// The tree owns the hierarchy; the holder owns the tree.
RKMRef<RKMBVHTree> MakeTree(RKMBVHNode *root) { return RKMRef<RKMBVHTree>::Adopt(new RKMBVHTree(root)); }
RKMRef<RKMBVHTree> MakeTree(const Plain &t) { return MakeTree(Build(t, 0)); }

// Shapes vary per tree: bushy or chain-like, with or without null children, leaves at mixed depths,
// and now and then a node whose children are all null (which is not a leaf).
Plain RandomTree(std::mt19937_64 &g, int maxNodes)
{
  Plain t;
  const bool chain = g() % 5 == 0;
  int maxDepth = chain ? 3 + static_cast<int>(g() % 10) : 1 + static_cast<int>(g() % 5);
  if (g() % 15 == 0)
    maxDepth = 0;
  const int maxFan = chain ? 1 : 2 + static_cast<int>(g() % 3);
  const int nullPercent = static_cast<int>(g() % 3) * 15;
  const int leafPercent = chain ? 5 : 10 + static_cast<int>(g() % 3) * 15;
  std::function<int(int)> grow = [&](int depth) {
    const int id = static_cast<int>(t.kids.size());
    t.kids.emplace_back();
    if (depth >= maxDepth || static_cast<int>(t.kids.size()) >= maxNodes ||
        (depth > 0 && static_cast<int>(g() % 100) < leafPercent))
      return id;
    // The root always has a real child and a second entry, so that few walks end at the first step.
    const int fan = (depth == 0 ? 2 : 1) + static_cast<int>(g() % static_cast<unsigned>(maxFan));
    for (int i = 0; i < fan; ++i)
    {
      const bool null = (depth > 0 || i > 0) && static_cast<int>(g() % 100) < nullPercent;
      const int c = null ? -1 : grow(depth + 1);
      t.kids[id].push_back(c);
    }
    return id;
  };
  grow(0);
  return t;
}

::testing::AssertionResult SameLog(const std::vector<std::string> &expected, const std::vector<std::string> &actual)
{
  const size_t n = std::min(expected.size(), actual.size());
  size_t i = 0;
  while (i < n && expected[i] == actual[i])
    ++i;
  if (i == n && expected.size() == actual.size())
    return ::testing::AssertionSuccess();
  ::testing::AssertionResult r = ::testing::AssertionFailure();
  r << "logs differ at call " << i << " (expected " << expected.size() << " calls, got " << actual.size() << ")";
  for (size_t k = i > 3 ? i - 3 : 0; k < i + 3 && k < std::max(expected.size(), actual.size()); ++k)
    r << "\n  " << k << ": expected [" << (k < expected.size() ? expected[k] : "-") << "] got ["
      << (k < actual.size() ? actual[k] : "-") << "]";
  return r;
}

TEST(RKMBVHDescentOperator, SingleDescentMatchesTheReferenceOnRandomTrees)
{
  std::printf("single descents over seeds 1..300\n");
  for (std::uint64_t seed = 1; seed <= 300; ++seed)
  {
    SCOPED_TRACE(::testing::Message() << "seed " << seed);
    std::mt19937_64 g(seed);
    const Plain plain = RandomTree(g, 60);
    const auto guard = MakeTree(plain);
    // First without a stop, to learn the length of the walk; then stopped somewhere inside it.
    long stopAfter = -1;
    for (int pass = 0; pass < 2; ++pass)
    {
      Script expected(seed), actual(seed);
      expected.stopAfter = actual.stopAfter = stopAfter;
      int depth = 0;
      const HRESULT want = RefSingle(plain, 0, expected, depth);
      RecordingOperator op(actual);
      op.Scramble();
      EXPECT_EQ(op.Descend(*guard), want) << "pass " << pass;
      EXPECT_TRUE(SameLog(expected.log, actual.log)) << "pass " << pass;
      EXPECT_EQ(op.GetDepth(), 0);
      stopAfter = static_cast<long>(g() % (expected.log.size() + 1));
    }
  }
}

TEST(RKMBVHDescentOperator, PairDescentMatchesTheReferenceOnRandomTrees)
{
  std::printf("pair descents over seeds 1..200\n");
  for (std::uint64_t seed = 1; seed <= 200; ++seed)
  {
    SCOPED_TRACE(::testing::Message() << "seed " << seed);
    std::mt19937_64 g(seed * 7919);
    const Plain first = RandomTree(g, 30), second = RandomTree(g, 30);
    const auto a = MakeTree(first), b = MakeTree(second);
    long stopAfter = -1;
    for (int pass = 0; pass < 2; ++pass)
    {
      Script expected(seed), actual(seed);
      expected.stopAfter = actual.stopAfter = stopAfter;
      int d1 = 0, d2 = 0;
      const HRESULT want = RefPair(first, 0, second, 0, expected, d1, d2);
      RecordingOperator op(actual);
      op.Scramble();
      EXPECT_EQ(op.Descend(*a, *b), want) << "pass " << pass;
      EXPECT_TRUE(SameLog(expected.log, actual.log)) << "pass " << pass;
      EXPECT_EQ(op.GetDepth1(), 0);
      EXPECT_EQ(op.GetDepth2(), 0);
      stopAfter = static_cast<long>(g() % (expected.log.size() + 1));
    }
  }
}

Plain Bushy()
{
  Plain p;
  p.kids = {{1, -1, 2}, {3, 4}, {}, {}, {}};
  return p;
}

Plain Single()
{
  Plain p;
  p.kids.resize(1);
  return p;
}

TEST(RKMBVHDescentOperator, FilterRejectingTheRootsEndsTheWalkAtOnce)
{
  const auto a = MakeTree(Bushy()), b = MakeTree(Bushy());
  Script s(1);
  s.filter1 = [](int) { return false; };
  s.filter2 = [](int, int) { return false; };
  RecordingOperator op(s);
  EXPECT_EQ(op.Descend(*a), S_OK);
  EXPECT_EQ(s.log, (std::vector<std::string>{"stop?0", "filter 0 @0 ->0"}));
  s.log.clear();
  EXPECT_EQ(op.Descend(*a, *b), S_OK);
  EXPECT_EQ(s.log, (std::vector<std::string>{"stop?0", "filter 0,0 @0,0 ->0"}));
}

TEST(RKMBVHDescentOperator, TwoSingleNodeTreesMeetOnce)
{
  const auto a = MakeTree(Single()), b = MakeTree(Single());
  Script s(1);
  s.filter2 = [](int, int) { return true; };
  s.leaf2 = [](int, int) { return S_FALSE; };
  RecordingOperator op(s);
  EXPECT_EQ(op.Descend(*a, *b), S_FALSE);
  EXPECT_EQ(s.log, (std::vector<std::string>{"stop?0", "filter 0,0 @0,0 ->1", "leaves 0,0 @0,0", "end 0,0 @0,0"}));
}

TEST(RKMBVHDescentOperator, ALeafOnlyOpensTheOtherSide)
{
  const auto leaf = MakeTree(Single()), deep = MakeTree(Bushy());
  Script s(1);
  s.filter2 = [](int, int) { return true; };
  s.leaf2 = [](int, int) { return S_OK; };
  // Asking to open the leaf's side must be ignored: it has nothing to open.
  s.choose = [](int, int) { return 1; };
  RecordingOperator op(s);
  EXPECT_EQ(op.Descend(*leaf, *deep), S_OK);
  const std::vector<std::string> expected = {
      "stop?0", "filter 0,0 @0,0 ->1", "choose 0,0 @0,0 ->1",
      "stop?0", "stop?0", "filter 0,1 @0,1 ->1", "choose 0,1 @0,1 ->1",
      "stop?0", "stop?0", "filter 0,3 @0,2 ->1", "leaves 0,3 @0,2", "end 0,3 @0,2",
      "stop?0", "stop?0", "filter 0,4 @0,2 ->1", "leaves 0,4 @0,2", "end 0,4 @0,2",
      "end 0,1 @0,1",
      // The null child is skipped after the stop question.
      "stop?0",
      "stop?0", "stop?0", "filter 0,2 @0,1 ->1", "leaves 0,2 @0,1", "end 0,2 @0,1",
      "end 0,0 @0,0"};
  EXPECT_TRUE(SameLog(expected, s.log));

  // The same with the sides swapped: choosing the leaf's side (2) is ignored as well.
  Script t(1);
  t.filter2 = s.filter2;
  t.leaf2 = s.leaf2;
  t.choose = [](int, int) { return 2; };
  RecordingOperator op2(t);
  EXPECT_EQ(op2.Descend(*deep, *leaf), S_OK);
  ASSERT_EQ(t.log.size(), expected.size());
  EXPECT_EQ(t.log[9], "filter 3,0 @2,0 ->1");
  EXPECT_EQ(t.log[18], "stop?0");
  EXPECT_EQ(t.log.back(), "end 0,0 @0,0");
}

TEST(RKMBVHDescentOperator, StopInsideALeafPairEndsTheWalkButClosesOpenPairs)
{
  Plain two;
  two.kids = {{1, 2}, {}, {}};
  const auto a = MakeTree(two), b = MakeTree(two);
  Script s(1);
  s.filter2 = [](int, int) { return true; };
  s.leaf2 = [](int, int) { return E_FAIL; };
  s.choose = [](int, int) { return 0; };
  s.stopInLeaves = true;
  RecordingOperator op(s);
  // The failed leaf pair is the last one descended: its result is the walk's.
  EXPECT_EQ(op.Descend(*a, *b), E_FAIL);
  const std::vector<std::string> expected = {
      "stop?0", "filter 0,0 @0,0 ->1", "choose 0,0 @0,0 ->0",
      "stop?0", "stop?0", "filter 1,1 @1,1 ->1", "leaves 1,1 @1,1", "end 1,1 @1,1",
      // The inner loop over b's children ends, and so does the next one: the outer loop does not ask.
      "stop?1", "stop?1", "end 0,0 @0,0"};
  EXPECT_TRUE(SameLog(expected, s.log));
}

TEST(RKMBVHDescentOperator, FailingLeafEndsTheSingleDescent)
{
  const auto t = MakeTree(Bushy());
  Script s(1);
  s.filter1 = [](int) { return true; };
  s.leaf1 = [](int n) { return n == 3 ? E_FAIL : S_OK; };
  RecordingOperator op(s);
  EXPECT_EQ(op.Descend(*t), E_FAIL);
  EXPECT_TRUE(SameLog({"stop?0", "filter 0 @0 ->1", "stop?0", "stop?0", "filter 1 @1 ->1", "stop?0", "stop?0",
                       "filter 3 @2 ->1", "leaf 3 @2"},
                      s.log));
}

TEST(RKMBVHDescentOperator, TreesWithoutRootAreRejected)
{
  const auto empty = MakeTree(nullptr), full = MakeTree(Bushy());
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
    hits.emplace_back(Id(a), Id(b));
    return S_OK;
  }
};

RKMBVHNode *VolumeLeaf(int id, RKMPolyBoundingVolume *bv)
{
  RKMBVHNode *n = new RKMBVHNode(bv);
  n->SetAttribute(new IdAttr(id));
  return n;
}

TEST(RKMBVHDescentOperator, UnboundedLeafIsNeverPrunedByItsAncestors)
{
  // The cylinder runs along x through (0, 100, 100): it meets the other tree's box near x = 1000,
  // which no bounded ancestor built from the unit boxes below would.
  RKMBVHNode *mid = VolumeLeaf(1, new RKMPolyAABB(RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  ASSERT_TRUE(SUCCEEDED(mid->AbsorbChild(VolumeLeaf(3, new RKMPolyAABB(RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f))))));
  ASSERT_TRUE(SUCCEEDED(mid->AbsorbChild(VolumeLeaf(
      4, new RKMPolyBoundingCylinder(RKMMathPoint(0, 100, 100), RKMMathVector(1, 0, 0), 1.0, -1.0)))));
  RKMBVHNode *root = VolumeLeaf(0, new RKMPolyAABB(RKMPolyBoxf(2.f, 3.f, 0.f, 1.f, 0.f, 1.f)));
  ASSERT_TRUE(SUCCEEDED(root->AbsorbChild(VolumeLeaf(2, new RKMPolyAABB(RKMPolyBoxf(2.f, 3.f, 0.f, 1.f, 0.f, 1.f))))));
  ASSERT_TRUE(SUCCEEDED(root->AbsorbChild(mid)));
  const auto withCylinder = MakeTree(root);

  const std::vector<RKMPolyBoundingVolume *> farVolumes = {
      new RKMPolyAABB(RKMPolyBoxf(999.f, 1001.f, 99.f, 101.f, 99.f, 101.f)),
      new RKMPolyBoundingSphere(RKMMathPoint(-5000, 100, 101.5), 1.0)};
  for (RKMPolyBoundingVolume *bv : farVolumes)
  {
    SCOPED_TRACE(bv->GetTypeID());
    const auto far = MakeTree(VolumeLeaf(0, bv));
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
  const auto t = MakeTree(Bushy());
  SilentCallback cb;
  RKMBVHPickingOperator picking(cb, 0.25);
  EXPECT_EQ(picking.GetTolerance(), 0.25);
  EXPECT_EQ(picking.Run(*t, RKMMathPoint(0, 0, 0), RKMMathVector(1, 0, 0)), E_FAIL);
  EXPECT_EQ(cb.calls, 0);
}
}
