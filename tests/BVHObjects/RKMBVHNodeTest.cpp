#include "BVHTestTrees.h"
#include "RKMGeomBVHAttribute.h"

#include <gtest/gtest.h>

#include <climits>
#include <thread>
#include <type_traits>

static_assert(!std::is_copy_constructible<RKMBVHNode>::value, "two copies would own the same children");
static_assert(!std::is_copy_assignable<RKMBVHNode>::value, "two copies would own the same children");
static_assert(!std::is_copy_constructible<RKMBVHNodeConst>::value, "two copies would own the same children");

namespace
{
using namespace bvhtest;

// A volume or node that writes "<name> deleted" to the journal: a double delete shows twice, a leak not
// at all. Deriving keeps the library's allocators.
template <class Base> class Counting : public Base
{
public:
  template <class... Args>
  Counting(Journal *j, std::string name, Args &&...args) : Base(std::forward<Args>(args)...), m_j(j), m_name(name)
  {
  }
  ~Counting() override { m_j->Add(m_name + " deleted"); }

private:
  Journal *m_j;
  std::string m_name;
};

RKMPolyAABB *Box(double x0, double x1, double y0, double y1, double z0, double z1)
{
  return new RKMPolyAABB(RKMPolyBoxf(x0, x1, y0, y1, z0, z1));
}

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

bool IsAllSpace(const RKMPolyBoundingVolume *bv)
{
  return bv && bv->GetTypeID() == RKMPolyBoundingVolume::TypePlane &&
         static_cast<const RKMPolyBoundingPlane *>(bv)->IsInfinitelyThick();
}

std::vector<std::string> Sorted(std::vector<std::string> v) { return std::sort(v.begin(), v.end()), v; }

TEST(RKMBVHNodeOwnership, DeletingARootDeletesEveryOwnedObjectOnce)
{
  Journal j;
  auto *root = new Counting<RKMBVHNode>(&j, "root");
  root->SetFirstBoundingVolume(new Counting<RKMPolyAABB>(&j, "root.bv1", RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  root->SetSecondBoundingVolume(new Counting<RKMPolyBoundingSphere>(&j, "root.bv2", RKMMathPoint(), 2.0));
  root->SetAttribute(new TagAttr(0, &j, "root.attr"));
  std::vector<std::string> expected = {"root", "root.attr", "root.bv1", "root.bv2"};
  // Two levels with a null child after each node, and leaves with and without volumes.
  for (int i = 0; i < 3; ++i)
  {
    const std::string n = "c" + std::to_string(i);
    auto *child = new Counting<RKMBVHNode>(&j, n);
    child->SetAttribute(new TagAttr(0, &j, n + ".attr"));
    child->SetFirstBoundingVolume(new Counting<RKMPolyBoundingSphere>(&j, n + ".bv1", RKMMathPoint(i, 0, 0), 1.0));
    expected.insert(expected.end(), {n, n + ".attr", n + ".bv1"});
    for (const std::string &g : {n + "g0", n + "g1"})
    {
      auto *grand = new Counting<RKMBVHNode>(&j, g);
      grand->SetSecondBoundingVolume(new Counting<RKMPolyAABB>(&j, g + ".bv2", RKMPolyBoxf()));
      expected.insert(expected.end(), {g, g + ".bv2"});
      child->AddChild(grand), child->AddChild(nullptr);
    }
    root->AddChild(child), root->AddChild(nullptr);
  }
  delete root;
  for (std::string &e : expected)
    e += " deleted";
  EXPECT_EQ(Sorted(j.entries), Sorted(expected));
}

TEST(RKMBVHNodeOwnership, DeletingAVeryDeepChainDoesNotRecurse)
{
  // A destructor that recursed would need far more than the default stack for this depth.
  constexpr int kDepth = 100000;
  Journal j;
  RKMBVHNode *head = Tagged(new RKMBVHNode(Box(0, 1, 0, 1, 0, 1)), 0, &j), *tail = head;
  for (int i = 1; i < kDepth; ++i)
  {
    RKMBVHNode *next = Tagged(new RKMBVHNode(Box(0, 1, 0, 1, 0, 1)), i, &j);
    ASSERT_EQ(tail->AddChild(next), 1);
    tail = next;
  }
  delete head;
  EXPECT_EQ(j.deaths.load(), kDepth);
}

TEST(RKMBVHNodeChildren, AddRemoveAndIterateWithoutDeleting)
{
  Journal j;
  RKMBVHNode parent, leaf, stranger;
  auto *a = new Counting<RKMBVHNode>(&j, "a"), *b = new Counting<RKMBVHNode>(&j, "b");
  EXPECT_EQ(parent.AddChild(a), 1);
  EXPECT_EQ(parent.AddChild(nullptr), 2);
  EXPECT_EQ(parent.AddChild(b), 3);
  EXPECT_EQ(parent.GetNbChildren(), 3);
  std::vector<const RKMBVHNodeConst *> seen, seenMutable;
  RKMBVHNode::ConstIterator it(parent);
  for (it.Begin(); !it.End(); ++it)
    seen.push_back(*it);
  RKMBVHNode::Iterator mit(parent);
  for (mit.Begin(); !mit.End(); ++mit)
    seenMutable.push_back(*mit);
  EXPECT_EQ(seen, (std::vector<const RKMBVHNodeConst *>{a, nullptr, b}));
  EXPECT_EQ(seenMutable, seen);
  // Begin restarts an exhausted iterator; over a leaf, both end at once.
  EXPECT_FALSE(it.Begin().End());
  EXPECT_EQ(*it, a);
  EXPECT_TRUE(RKMBVHNode::ConstIterator(leaf).Begin().End());
  EXPECT_TRUE(RKMBVHNode::Iterator(leaf).Begin().End());

  EXPECT_EQ(parent.RemoveChild(&stranger), E_FAIL);
  EXPECT_EQ(parent.RemoveChild(a), S_OK);
  EXPECT_EQ(parent.RemoveChild(a), E_FAIL);
  EXPECT_EQ(parent.GetNbChildren(), 2);
  EXPECT_EQ(parent.GetChildren()[1], nullptr);
  EXPECT_EQ(parent.GetChildren()[2], b);
  parent.RemoveAllChildren();
  EXPECT_EQ(parent.GetNbChildren(), 0);
  EXPECT_TRUE(j.entries.empty()) << "removing must only unlink";
  delete a;
  delete b;
  EXPECT_EQ(Sorted(j.entries), (std::vector<std::string>{"a deleted", "b deleted"}));
}

TEST(RKMBVHNodeChildren, RecursiveOperationsSkipNullChildren)
{
  Journal j;
  SpyNode root(&j, "root");
  SpyNode *a = new SpyNode(&j, "a"), *aa = new SpyNode(&j, "aa"), *b = new SpyNode(&j, "b");
  Tagged(&root, 0, &j, "root"), Tagged(a, 1, &j, "a"), Tagged(aa, 2, &j, "aa");
  a->AddChild(nullptr), a->AddChild(aa);
  root.AddChild(nullptr), root.AddChild(a), root.AddChild(nullptr), root.AddChild(b);
  root.ForceExpand();
  root.ForceCollapse(3);
  // Children are flushed before their parent; b has no attribute and must simply be skipped.
  root.FlushMemory();
  EXPECT_EQ(j.entries, (std::vector<std::string>{"expand root", "expand a", "expand aa", "expand b", "collapse root 3",
                                                 "collapse a 3", "collapse aa 3", "collapse b 3", "aa flushed",
                                                 "a flushed", "root flushed"}));
}

TEST(RKMBVHNodeAbsorb, RejectsMissingInputsWithoutChangingAnything)
{
  RKMPolyAABB *volume = Box(0, 1, 0, 1, 0, 1);
  const RKMPolyAABB before(*volume);
  RKMBVHNode parent(volume), bare, noVolume, child(Box(5, 6, 5, 6, 5, 6));
  bare.SetSecondBoundingVolume(Box(5, 6, 5, 6, 5, 6));
  EXPECT_EQ(parent.AbsorbChild(nullptr), E_INVALIDARG);
  EXPECT_EQ(parent.AbsorbChild(&bare), E_FAIL);
  EXPECT_EQ(noVolume.AbsorbChild(&child), E_FAIL);
  EXPECT_EQ(parent.GetNbChildren() + noVolume.GetNbChildren(), 0);
  ASSERT_EQ(parent.GetFirstBoundingVolume(), volume);
  EXPECT_TRUE(*volume == before);
  EXPECT_EQ(noVolume.GetFirstBoundingVolume(), nullptr);
}

TEST(RKMBVHNodeAbsorb, GrowsBothVolumesOverTheChild)
{
  RKMBVHNode parent(Box(0, 1, 0, 1, 0, 1));
  parent.SetSecondBoundingVolume(new RKMPolyBoundingSphere(RKMMathPoint(0, 0, 0), 1.0));
  RKMBVHNode *boxChild = new RKMBVHNode(Box(2, 3, -1, 0.5, 0, 4));
  EXPECT_TRUE(SUCCEEDED(parent.AbsorbChild(boxChild)));
  EXPECT_EQ(parent.GetNbChildren(), 1);
  EXPECT_EQ(parent.GetChildren()[1], boxChild);
  ASSERT_EQ(parent.GetFirstBoundingVolume()->GetTypeID(), RKMPolyBoundingVolume::TypeAABB);
  EXPECT_TRUE(Holds(parent.GetFirstBoundingVolume(), Corners(0, 3, -1, 1, 0, 4)));
  // Without a second volume of its own, the child's first one must be enclosed by the second.
  EXPECT_TRUE(Holds(parent.GetSecondBoundingVolume(), Corners(2, 3, -1, 0.5, 0, 4)));

  // The child's second volume, not its first, governs the parent's second volume: the first box is far
  // away, so a sphere grown over it would reach x = -100.
  RKMBVHNode *twoVolumes = new RKMBVHNode(Box(-100, -99, 0, 1, 0, 1));
  twoVolumes->SetSecondBoundingVolume(new RKMPolyBoundingSphere(RKMMathPoint(0, 8, 0), 1.0));
  EXPECT_TRUE(SUCCEEDED(parent.AbsorbChild(twoVolumes)));
  EXPECT_EQ(parent.GetNbChildren(), 2);
  EXPECT_TRUE(Holds(parent.GetFirstBoundingVolume(), Corners(-100, 3, -1, 1, 0, 4)));
  EXPECT_TRUE(Holds(parent.GetSecondBoundingVolume(), Corners(2, 3, -1, 0.5, 0, 4)));
  EXPECT_TRUE(Holds(parent.GetSecondBoundingVolume(),
                    {RKMMathPoint(0, 9, 0), RKMMathPoint(0, 7, 0), RKMMathPoint(1, 8, 0), RKMMathPoint(0, 8, -1)}));
  EXPECT_FALSE(Holds(parent.GetSecondBoundingVolume(), {RKMMathPoint(-99.5, 0.5, 0.5)}));

  // A parent without a second volume does not get one.
  RKMBVHNode single(new RKMPolyBoundingSphere(RKMMathPoint(), 1.0));
  RKMBVHNode *c = new RKMBVHNode(new RKMPolyBoundingSphere(RKMMathPoint(3, 0, 0), 0.5));
  c->SetSecondBoundingVolume(Box(0, 1, 0, 1, 0, 1));
  EXPECT_TRUE(SUCCEEDED(single.AbsorbChild(c)));
  EXPECT_EQ(single.GetSecondBoundingVolume(), nullptr);
  EXPECT_TRUE(Holds(single.GetFirstBoundingVolume(), {RKMMathPoint(3.5, 0, 0), RKMMathPoint(-1, 0, 0)}));
}

// A slab child turns a box parent into a slab; an unbounded child turns any parent into all of space.
// Either way the replaced volumes belong to the node and must be deleted.
TEST(RKMBVHNodeAbsorb, SlabOrUnboundedChildReplacesTheParentsVolumes)
{
  Journal j;
  RKMBVHNode slabParent(new Counting<RKMPolyAABB>(&j, "old", RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  EXPECT_TRUE(SUCCEEDED(slabParent.AbsorbChild(
      new RKMBVHNode(new RKMPolyBoundingPlane(RKMMathVector(0, 0, 1), RKMMathPoint(0, 0, 5), 0.5)))));
  EXPECT_EQ(slabParent.GetNbChildren(), 1);
  const RKMPolyBoundingVolume *bv = slabParent.GetFirstBoundingVolume();
  ASSERT_EQ(bv->GetTypeID(), RKMPolyBoundingVolume::TypePlane);
  EXPECT_EQ(j.entries, std::vector<std::string>{"old deleted"});
  // The child's slab stretches without bound in x and y.
  EXPECT_TRUE(Holds(bv, Corners(0, 1, 0, 1, 0, 1)));
  EXPECT_TRUE(Holds(bv, {RKMMathPoint(1e6, -1e6, 5.4), RKMMathPoint(-1e6, 1e6, 4.6), RKMMathPoint(0, 0, 5)}));

  const RKMPolyBoundingCylinder infinite(RKMMathPoint(0, 100, 100), RKMMathVector(1, 0, 0), 1.0, -1.0);
  ASSERT_TRUE(infinite.IsInfinite());
  RKMBVHNode boxParent(new Counting<RKMPolyAABB>(&j, "box", RKMPolyBoxf(0.f, 1.f, 0.f, 1.f, 0.f, 1.f)));
  boxParent.SetSecondBoundingVolume(new Counting<RKMPolyBoundingSphere>(&j, "sphere", RKMMathPoint(), 1.0));
  RKMBVHNode sphereParent(new RKMPolyBoundingSphere(RKMMathPoint(), 1.0));
  for (RKMBVHNode *parent : {&boxParent, &sphereParent})
  {
    EXPECT_TRUE(SUCCEEDED(parent->AbsorbChild(new RKMBVHNode(new RKMPolyBoundingCylinder(infinite)))));
    EXPECT_EQ(parent->GetNbChildren(), 1);
    EXPECT_TRUE(IsAllSpace(parent->GetFirstBoundingVolume()));
    EXPECT_TRUE(Holds(parent->GetFirstBoundingVolume(), {RKMMathPoint(-1e9, 100, 100), RKMMathPoint(0, 0, 0)}));
  }
  EXPECT_TRUE(IsAllSpace(boxParent.GetSecondBoundingVolume()));
  EXPECT_EQ(Sorted(j.entries), (std::vector<std::string>{"box deleted", "old deleted", "sphere deleted"}));
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
  RKMBVHAttribute copy(attr), assigned;
  assigned = attr;
  for (const RKMBVHAttribute *a : {&attr, &copy, &assigned})
    EXPECT_TRUE(!a->TestFlag(0x100) && a->TestFlag(0x10000) && a->TestFlag(0x20000));

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
    threads.emplace_back(
        [&, t]
        {
          const int keep = 1 << (8 * t), toggle = 1 << (8 * t + 1);
          ready.fetch_add(1);
          while (ready.load() < kThreads)
            std::this_thread::yield();
          for (int i = 0; i < 20000; ++i)
            attr.EnableFlag(toggle), attr.EnableFlag(keep), attr.DisableFlag(toggle);
        });
  for (std::thread &t : threads)
    t.join();
  for (int t = 0; t < kThreads; ++t)
    EXPECT_TRUE(attr.TestFlag(1 << (8 * t)) && !attr.TestFlag(1 << (8 * t + 1))) << t;
}
} // namespace
