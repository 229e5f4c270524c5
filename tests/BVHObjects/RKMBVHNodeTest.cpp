#include "RKMBVHAttribute.h"
#include "RKMBVHNode.h"
#include "RKMGeomBVHAttribute.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"

#include <gtest/gtest.h>

#include <atomic>
#include <climits>
#include <map>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

namespace
{
// Every owned object reports its own death, so that a double delete shows as a count of 2 and a leak
// as a missing entry.
using Deaths = std::map<std::string, int>;

class CountingAttr : public RKMBVHAttribute
{
public:
  CountingAttr(Deaths *deaths, std::string name, std::vector<std::string> *flushLog = nullptr)
      : m_deaths(deaths), m_name(std::move(name)), m_flushLog(flushLog)
  {
  }
  ~CountingAttr() override { ++(*m_deaths)[m_name]; }
  void FlushComputedData() override
  {
    if (m_flushLog)
      m_flushLog->push_back(m_name);
  }

private:
  Deaths *m_deaths;
  std::string m_name;
  std::vector<std::string> *m_flushLog;
};

// Volumes come from the library's pool and nodes from the node pool; deriving keeps those allocators.
template <class Base>
class Counting : public Base
{
public:
  template <class... Args>
  Counting(Deaths *deaths, std::string name, Args &&...args)
      : Base(std::forward<Args>(args)...), m_deaths(deaths), m_name(std::move(name))
  {
  }
  ~Counting() override { ++(*m_deaths)[m_name]; }

private:
  Deaths *m_deaths;
  std::string m_name;
};
using CountingBox = Counting<RKMPolyAABB>;
using CountingSphere = Counting<RKMPolyBoundingSphere>;
using CountingNode = Counting<RKMBVHNode>;

// Records the recursive calls a parent makes into it.
class SpyNode : public RKMBVHNode
{
public:
  explicit SpyNode(std::vector<std::string> *log, std::string name) : m_log(log), m_name(std::move(name)) {}
  void ForceExpand() override
  {
    m_log->push_back("expand " + m_name);
    RKMBVHNode::ForceExpand();
  }
  void ForceCollapse(int level) override
  {
    m_log->push_back("collapse " + m_name + " " + std::to_string(level));
    RKMBVHNode::ForceCollapse(level);
  }

private:
  std::vector<std::string> *m_log;
  std::string m_name;
};

RKMPolyAABB *Box(double x0, double x1, double y0, double y1, double z0, double z1)
{
  return new RKMPolyAABB(RKMPolyBoxf(x0, x1, y0, y1, z0, z1));
}

RKMBVHNode *Leaf(RKMPolyBoundingVolume *bv) { return new RKMBVHNode(bv); }

std::vector<RKMMathPoint> Corners(double x0, double x1, double y0, double y1, double z0, double z1)
{
  std::vector<RKMMathPoint> out;
  for (double x : {x0, x1})
    for (double y : {y0, y1})
      for (double z : {z0, z1})
        out.emplace_back(x, y, z);
  return out;
}

::testing::AssertionResult Holds(const RKMPolyBoundingVolume *bv, const std::vector<RKMMathPoint> &points)
{
  if (!bv)
    return ::testing::AssertionFailure() << "no volume";
  for (const RKMMathPoint &p : points)
    if (!RKMPolyBVProperties::IsPointInsideBV(*bv, p))
      return ::testing::AssertionFailure() << "(" << p.x << ", " << p.y << ", " << p.z << ") outside";
  return ::testing::AssertionSuccess();
}

const RKMPolyBoundingPlane *AsAllSpace(const RKMPolyBoundingVolume *bv)
{
  if (!bv || bv->GetTypeID() != RKMPolyBoundingVolume::TypePlane)
    return nullptr;
  const RKMPolyBoundingPlane *p = static_cast<const RKMPolyBoundingPlane *>(bv);
  return p->IsInfinitelyThick() ? p : nullptr;
}

static_assert(!std::is_copy_constructible<RKMBVHNode>::value, "two copies would own the same children");
static_assert(!std::is_copy_assignable<RKMBVHNode>::value, "two copies would own the same children");
static_assert(!std::is_copy_constructible<RKMBVHNodeConst>::value, "two copies would own the same children");

TEST(RKMBVHNodeOwnership, DeletingARootDeletesEveryOwnedObjectOnce)
{
  Deaths deaths;
  CountingNode *root = new CountingNode(&deaths, "root");
  root->SetFirstBoundingVolume(new CountingBox(&deaths, "root.bv1", RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  root->SetSecondBoundingVolume(new CountingSphere(&deaths, "root.bv2", RKMMathPoint(), 2.0));
  root->SetAttribute(new CountingAttr(&deaths, "root.attr"));
  std::vector<std::string> expected = {"root", "root.attr", "root.bv1", "root.bv2"};
  // Two levels with a null child in the middle of each list, and leaves with and without volumes.
  for (int i = 0; i < 3; ++i)
  {
    const std::string n = "c" + std::to_string(i);
    CountingNode *child = new CountingNode(&deaths, n);
    child->SetAttribute(new CountingAttr(&deaths, n + ".attr"));
    child->SetFirstBoundingVolume(new CountingSphere(&deaths, n + ".bv1", RKMMathPoint(i, 0, 0), 1.0));
    expected.insert(expected.end(), {n, n + ".attr", n + ".bv1"});
    for (int j = 0; j < 2; ++j)
    {
      const std::string g = n + "g" + std::to_string(j);
      CountingNode *grand = new CountingNode(&deaths, g);
      grand->SetSecondBoundingVolume(new CountingBox(&deaths, g + ".bv2", RKMPolyBoxf()));
      expected.insert(expected.end(), {g, g + ".bv2"});
      child->AddChild(grand);
      child->AddChild(nullptr);
    }
    root->AddChild(child);
    root->AddChild(nullptr);
  }
  delete root;
  for (const std::string &name : expected)
    EXPECT_EQ(deaths[name], 1) << name;
  EXPECT_EQ(deaths.size(), expected.size());
}

TEST(RKMBVHNodeOwnership, DeletingAVeryDeepChainDoesNotRecurse)
{
  // A destructor that recursed would need far more than the default stack for this depth.
  constexpr int kDepth = 100000;
  int deaths = 0;
  struct Attr : RKMBVHAttribute
  {
    explicit Attr(int *d) : m_d(d) {}
    ~Attr() override { ++*m_d; }
    int *m_d;
  };
  RKMBVHNode *head = new RKMBVHNode(Box(0, 1, 0, 1, 0, 1));
  head->SetAttribute(new Attr(&deaths));
  RKMBVHNode *tail = head;
  for (int i = 1; i < kDepth; ++i)
  {
    RKMBVHNode *next = new RKMBVHNode(Box(0, 1, 0, 1, 0, 1));
    next->SetAttribute(new Attr(&deaths));
    ASSERT_EQ(tail->AddChild(next), 1);
    tail = next;
  }
  delete head;
  EXPECT_EQ(deaths, kDepth);
}

TEST(RKMBVHNodeChildren, AddRemoveAndIterate)
{
  Deaths deaths;
  RKMBVHNode parent;
  CountingNode *a = new CountingNode(&deaths, "a");
  CountingNode *b = new CountingNode(&deaths, "b");
  EXPECT_EQ(parent.AddChild(a), 1);
  EXPECT_EQ(parent.AddChild(nullptr), 2);
  EXPECT_EQ(parent.AddChild(b), 3);
  EXPECT_EQ(parent.GetNbChildren(), 3);

  std::vector<const RKMBVHNodeConst *> seen;
  RKMBVHNode::ConstIterator it(parent);
  for (it.Begin(); !it.End(); ++it)
    seen.push_back(*it);
  EXPECT_EQ(seen, (std::vector<const RKMBVHNodeConst *>{a, nullptr, b}));
  // Begin must restart an exhausted iterator.
  EXPECT_FALSE(it.Begin().End());
  EXPECT_EQ(*it, a);

  std::vector<RKMBVHNodeConst *> seenMutable;
  RKMBVHNode::Iterator mit(parent);
  for (mit.Begin(); !mit.End(); ++mit)
    seenMutable.push_back(*mit);
  EXPECT_EQ(seenMutable, (std::vector<RKMBVHNodeConst *>{a, nullptr, b}));

  RKMBVHNode stranger;
  EXPECT_EQ(parent.RemoveChild(&stranger), E_FAIL);
  EXPECT_EQ(parent.GetNbChildren(), 3);
  EXPECT_EQ(parent.RemoveChild(a), S_OK);
  EXPECT_EQ(parent.RemoveChild(a), E_FAIL);
  EXPECT_TRUE(deaths.empty()) << "RemoveChild must only unlink";
  EXPECT_EQ(parent.GetNbChildren(), 2);
  EXPECT_EQ(parent.GetChildren()[1], nullptr);
  EXPECT_EQ(parent.GetChildren()[2], b);

  parent.RemoveAllChildren();
  EXPECT_EQ(parent.GetNbChildren(), 0);
  EXPECT_TRUE(deaths.empty()) << "RemoveAllChildren must only unlink";
  delete a;
  delete b;
  EXPECT_EQ(deaths["a"], 1);
  EXPECT_EQ(deaths["b"], 1);
}

TEST(RKMBVHNodeChildren, IteratorsOverALeafEndAtOnce)
{
  RKMBVHNode leaf;
  RKMBVHNode::ConstIterator cit(leaf);
  EXPECT_TRUE(cit.Begin().End());
  RKMBVHNode::Iterator it(leaf);
  EXPECT_TRUE(it.Begin().End());
}

TEST(RKMBVHNodeChildren, RecursiveOperationsSkipNullChildren)
{
  std::vector<std::string> log;
  Deaths deaths;
  SpyNode root(&log, "root");
  root.SetAttribute(new CountingAttr(&deaths, "root", &log));
  SpyNode *a = new SpyNode(&log, "a");
  a->SetAttribute(new CountingAttr(&deaths, "a", &log));
  SpyNode *aa = new SpyNode(&log, "aa");
  aa->SetAttribute(new CountingAttr(&deaths, "aa", &log));
  a->AddChild(nullptr);
  a->AddChild(aa);
  SpyNode *b = new SpyNode(&log, "b");
  root.AddChild(nullptr);
  root.AddChild(a);
  root.AddChild(nullptr);
  root.AddChild(b);

  root.ForceExpand();
  EXPECT_EQ(log, (std::vector<std::string>{"expand root", "expand a", "expand aa", "expand b"}));
  log.clear();
  root.ForceCollapse(3);
  EXPECT_EQ(log, (std::vector<std::string>{"collapse root 3", "collapse a 3", "collapse aa 3", "collapse b 3"}));
  log.clear();
  // Children are flushed before their parent; b has no attribute and must simply be skipped.
  root.FlushMemory();
  EXPECT_EQ(log, (std::vector<std::string>{"aa", "a", "root"}));
}

TEST(RKMBVHNodeAbsorb, RejectsMissingInputsWithoutChangingAnything)
{
  RKMPolyAABB *volume = Box(0, 1, 0, 1, 0, 1);
  const RKMPolyAABB before(*volume);
  RKMBVHNode parent(volume);
  EXPECT_EQ(parent.AbsorbChild(nullptr), E_INVALIDARG);

  RKMBVHNode bare;
  bare.SetSecondBoundingVolume(Box(5, 6, 5, 6, 5, 6));
  EXPECT_EQ(parent.AbsorbChild(&bare), E_FAIL);
  EXPECT_EQ(parent.GetNbChildren(), 0);
  ASSERT_EQ(parent.GetFirstBoundingVolume(), volume);
  EXPECT_TRUE(*volume == before);

  RKMBVHNode noVolume;
  RKMBVHNode child(Box(5, 6, 5, 6, 5, 6));
  EXPECT_EQ(noVolume.AbsorbChild(&child), E_FAIL);
  EXPECT_EQ(noVolume.GetNbChildren(), 0);
  EXPECT_EQ(noVolume.GetFirstBoundingVolume(), nullptr);
}

TEST(RKMBVHNodeAbsorb, GrowsBothVolumesOverTheChild)
{
  RKMBVHNode parent(Box(0, 1, 0, 1, 0, 1));
  parent.SetSecondBoundingVolume(new RKMPolyBoundingSphere(RKMMathPoint(0, 0, 0), 1.0));

  RKMBVHNode *boxChild = Leaf(Box(2, 3, -1, 0.5, 0, 4));
  EXPECT_TRUE(SUCCEEDED(parent.AbsorbChild(boxChild)));
  EXPECT_EQ(parent.GetNbChildren(), 1);
  EXPECT_EQ(parent.GetChildren()[1], boxChild);
  ASSERT_EQ(parent.GetFirstBoundingVolume()->GetTypeID(), RKMPolyBoundingVolume::TypeAABB);
  EXPECT_TRUE(Holds(parent.GetFirstBoundingVolume(), Corners(0, 3, -1, 1, 0, 4)));
  // Without a second volume of its own, the child's first one must be enclosed by the second.
  EXPECT_TRUE(Holds(parent.GetSecondBoundingVolume(), Corners(2, 3, -1, 0.5, 0, 4)));

  // The child's second volume, not its first, governs the parent's second volume: the first box is far
  // away, so a sphere grown over it would reach x = -100.
  RKMBVHNode *twoVolumes = Leaf(Box(-100, -99, 0, 1, 0, 1));
  twoVolumes->SetSecondBoundingVolume(new RKMPolyBoundingSphere(RKMMathPoint(0, 8, 0), 1.0));
  EXPECT_TRUE(SUCCEEDED(parent.AbsorbChild(twoVolumes)));
  EXPECT_EQ(parent.GetNbChildren(), 2);
  EXPECT_TRUE(Holds(parent.GetFirstBoundingVolume(), Corners(-100, 3, -1, 1, 0, 4)));
  EXPECT_TRUE(Holds(parent.GetSecondBoundingVolume(), Corners(2, 3, -1, 0.5, 0, 4)));
  EXPECT_TRUE(Holds(parent.GetSecondBoundingVolume(),
                    {RKMMathPoint(0, 9, 0), RKMMathPoint(0, 7, 0), RKMMathPoint(1, 8, 0), RKMMathPoint(0, 8, -1)}));
  EXPECT_FALSE(RKMPolyBVProperties::IsPointInsideBV(*parent.GetSecondBoundingVolume(), RKMMathPoint(-99.5, 0.5, 0.5)));

  // A parent without a second volume does not get one.
  RKMBVHNode single(new RKMPolyBoundingSphere(RKMMathPoint(), 1.0));
  RKMBVHNode *c = Leaf(new RKMPolyBoundingSphere(RKMMathPoint(3, 0, 0), 0.5));
  c->SetSecondBoundingVolume(Box(0, 1, 0, 1, 0, 1));
  EXPECT_TRUE(SUCCEEDED(single.AbsorbChild(c)));
  EXPECT_EQ(single.GetSecondBoundingVolume(), nullptr);
  EXPECT_TRUE(Holds(single.GetFirstBoundingVolume(), {RKMMathPoint(3.5, 0, 0), RKMMathPoint(-1, 0, 0)}));
}

TEST(RKMBVHNodeAbsorb, SlabChildTurnsABoxParentIntoASlab)
{
  Deaths deaths;
  RKMBVHNode parent(new CountingBox(&deaths, "old", RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  RKMBVHNode *slabChild = Leaf(new RKMPolyBoundingPlane(RKMMathVector(0, 0, 1), RKMMathPoint(0, 0, 5), 0.5));
  EXPECT_TRUE(SUCCEEDED(parent.AbsorbChild(slabChild)));
  EXPECT_EQ(parent.GetNbChildren(), 1);
  const RKMPolyBoundingVolume *bv = parent.GetFirstBoundingVolume();
  ASSERT_EQ(bv->GetTypeID(), RKMPolyBoundingVolume::TypePlane);
  EXPECT_EQ(deaths["old"], 1) << "the replaced box belongs to the node and must be deleted";
  EXPECT_TRUE(Holds(bv, Corners(0, 1, 0, 1, 0, 1)));
  // The child's slab stretches without bound in x and y.
  EXPECT_TRUE(Holds(bv, {RKMMathPoint(1e6, -1e6, 5.4), RKMMathPoint(-1e6, 1e6, 4.6), RKMMathPoint(0, 0, 5)}));
}

TEST(RKMBVHNodeAbsorb, UnboundedChildMakesTheParentAllOfSpace)
{
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(0, 100, 100), RKMMathVector(1, 0, 0), 1.0, -1.0);
  ASSERT_TRUE(infinite.IsInfinite());
  Deaths deaths;
  RKMBVHNode boxParent(new CountingBox(&deaths, "box", RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  boxParent.SetSecondBoundingVolume(new CountingSphere(&deaths, "sphere", RKMMathPoint(), 1.0));
  RKMBVHNode *child = Leaf(new RKMPolyBoundingCylinder(infinite));
  EXPECT_TRUE(SUCCEEDED(boxParent.AbsorbChild(child)));
  EXPECT_EQ(boxParent.GetNbChildren(), 1);
  EXPECT_NE(AsAllSpace(boxParent.GetFirstBoundingVolume()), nullptr);
  EXPECT_NE(AsAllSpace(boxParent.GetSecondBoundingVolume()), nullptr);
  EXPECT_EQ(deaths["box"], 1);
  EXPECT_EQ(deaths["sphere"], 1);

  RKMBVHNode sphereParent(new RKMPolyBoundingSphere(RKMMathPoint(), 1.0));
  EXPECT_TRUE(SUCCEEDED(sphereParent.AbsorbChild(Leaf(new RKMPolyBoundingCylinder(infinite)))));
  EXPECT_NE(AsAllSpace(sphereParent.GetFirstBoundingVolume()), nullptr);
  EXPECT_TRUE(Holds(sphereParent.GetFirstBoundingVolume(), {RKMMathPoint(-1e9, 100, 100), RKMMathPoint(0, 0, 0)}));
}

TEST(RKMBVHAttribute, FlagsInEveryByteOfTheWord)
{
  RKMBVHAttribute attr;
  EXPECT_FALSE(attr.TestFlag(-1));
  for (int bit : {0x1, 0x80, 0x100, 0x10000, 0x1000000, INT_MIN})
  {
    attr.EnableFlag(bit);
    EXPECT_TRUE(attr.TestFlag(bit)) << std::hex << bit;
    // Any one tested bit that is set is enough.
    EXPECT_TRUE(attr.TestFlag(bit | 0x40)) << std::hex << bit;
    EXPECT_FALSE(attr.TestFlag(0x40)) << std::hex << bit;
    attr.DisableFlag(bit);
    EXPECT_FALSE(attr.TestFlag(-1)) << std::hex << bit;
  }
  attr.EnableFlag(0x30100);
  attr.DisableFlag(0x100);
  EXPECT_FALSE(attr.TestFlag(0x100));
  EXPECT_TRUE(attr.TestFlag(0x10000));
  EXPECT_TRUE(attr.TestFlag(0x20000));

  RKMBVHAttribute copy(attr);
  EXPECT_TRUE(copy.TestFlag(0x20000));
  RKMBVHAttribute assigned;
  assigned = attr;
  EXPECT_TRUE(assigned.TestFlag(0x10000));
  EXPECT_FALSE(assigned.TestFlag(0x100));

  EXPECT_EQ(attr.CastAsGeomAttribute(), nullptr);
  EXPECT_EQ(attr.CastAsPolyAttribute(), nullptr);
  RKMGeomBVHAttribute geom;
  RKMBVHAttribute &asBase = geom;
  EXPECT_EQ(asBase.CastAsGeomAttribute(), &geom);
  EXPECT_EQ(static_cast<const RKMBVHAttribute &>(geom).CastAsGeomAttribute(), &geom);
}

TEST(RKMBVHAttribute, ConcurrentFlagChangesAreNotLost)
{
  // Each thread owns one bit it sets and one it toggles, in a different byte of the word per thread;
  // a plain read-modify-write would lose some of the other threads' bits.
  constexpr int kThreads = 4;
  RKMBVHAttribute attr;
  std::atomic<int> ready{0};
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t)
    threads.emplace_back([&, t] {
      const int keep = 1 << (8 * t);
      const int toggle = 1 << (8 * t + 1);
      ready.fetch_add(1);
      while (ready.load() < kThreads)
        std::this_thread::yield();
      for (int i = 0; i < 20000; ++i)
      {
        attr.EnableFlag(toggle);
        attr.EnableFlag(keep);
        attr.DisableFlag(toggle);
      }
    });
  for (std::thread &t : threads)
    t.join();
  for (int t = 0; t < kThreads; ++t)
  {
    EXPECT_TRUE(attr.TestFlag(1 << (8 * t))) << t;
    EXPECT_FALSE(attr.TestFlag(1 << (8 * t + 1))) << t;
  }
}
}
