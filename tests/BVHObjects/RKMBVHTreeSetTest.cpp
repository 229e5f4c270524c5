#include "RKMBVHNode.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeObserver.h"
#include "RKMBVHTreeSet.h"
#include "RKMBVHTreeSetObserver.h"
#include "RKMMath3x3Matrix.h"
#include "RKMMathBox.h"
#include "RKMMathTransformation.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVProperties.h"
#include "RKMRef.h"

#include <gtest/gtest.h>

#include <atomic>
#include <functional>
#include <map>
#include <memory>
#include <string>
#include <thread>
#include <type_traits>
#include <utility>
#include <vector>

static_assert(!std::is_copy_constructible<RKMBVHTreeSet>::value, "a set owns its leaves");
static_assert(!std::is_copy_assignable<RKMBVHTreeSet>::value, "a set owns its leaves");

namespace
{
using TreeRef = RKMRef<RKMBVHTree>;

// Holds a reference the caller already owns.
template <class T>
RKMRef<T> Adopt(T *object)
{
  return RKMRef<T>::Adopt(object);
}

// An object tree over the box [x, x+1] × [0,1] × [0,1], optionally with a second volume on the root.
TreeRef MakeObject(double x, bool withSecond = false)
{
  RKMBVHNode *root = new RKMBVHNode(new RKMPolyAABB(RKMMathBox(x, x + 1, 0, 1, 0, 1)));
  if (withSecond)
    root->SetSecondBoundingVolume(new RKMPolyAABB(RKMMathBox(x, x + 2, 0, 2, 0, 2)));
  root->AbsorbChild(new RKMBVHNode(new RKMPolyAABB(RKMMathBox(x, x + 0.5, 0, 0.5, 0, 0.5))));
  return Adopt(new RKMBVHTree(root));
}

bool Inside(const RKMPolyBoundingVolume *bv, const RKMMathPoint &p)
{
  return bv && RKMPolyBVProperties::IsPointInsideBV(*bv, p);
}

const RKMBVHNodeConst *NodeOf(const RKMBVHTreeSet &set, int id)
{
  const RKMBVHNodeConst *node = nullptr;
  return set.GetObjectNode(id, node) == S_OK ? node : nullptr;
}

class TreeSpy : public RKMBVHTreeObserver
{
public:
  void OnTreeDeletion() override { ++deletions; }
  void OnTreeFlush() override { ++flushes; }
  std::atomic<int> deletions{0}, flushes{0};

private:
  ~TreeSpy() override = default;
};

class SetSpy : public RKMBVHTreeSetObserver
{
public:
  SetSpy(std::vector<std::string> *journal, std::string name, int answer = -1)
      : m_journal(journal), m_name(std::move(name)), m_answer(answer)
  {
  }

  void OnAddTree(int id, RKMBVHTree *, const RKMMathTransformation *) override { Log("add", id); }
  void OnModifyTreePosition(int id, const RKMMathTransformation *) override { Log("move", id); }
  void OnDesactivateTree(int id) override { Log("off", id); }
  void OnActivateTree(int id) override { Log("on", id); }
  void OnDeactivateAll() override { Log("alloff", 0); }
  void OnActivateAll() override { Log("allon", 0); }
  void OnRemoveTree(int id) override { Log("remove", id); }
  void OnVirtualRemoveTree(int id) override { Log("vremove", id); }
  void OnFlushTree(int id) override { Log("flush", id); }
  int OnCheckPoint() override
  {
    Log("check", 0);
    return m_answer;
  }

  std::function<void(SetSpy &, const std::string &, int)> hook;

private:
  ~SetSpy() override { m_magic = 0; }
  void Log(const char *what, int id)
  {
    // A freed observer is caught here, and by AddressSanitizer at once.
    EXPECT_EQ(m_magic, 0x5eed) << m_name;
    m_journal->push_back(m_name + " " + what + " " + std::to_string(id));
    if (hook)
      hook(*this, what, id);
  }

  std::vector<std::string> *m_journal;
  std::string m_name;
  int m_answer;
  int m_magic = 0x5eed;
};

// The leaves reached from node, each counted; every point given for a leaf must lie in all its ancestors.
void Walk(const RKMBVHNodeConst *node, std::vector<const RKMBVHNodeConst *> &ancestors,
          std::map<const RKMBVHNodeConst *, int> &seen,
          const std::map<const RKMBVHNodeConst *, std::vector<RKMMathPoint>> &samples)
{
  if (node->GetNbChildren() == 0)
  {
    ++seen[node];
    auto it = samples.find(node);
    if (it != samples.end())
    {
      for (const RKMBVHNodeConst *a : ancestors)
        for (const RKMMathPoint &p : it->second)
        {
          EXPECT_TRUE(Inside(a->GetFirstBoundingVolume(), p)) << p.x << " " << p.y << " " << p.z;
        }
    }
    return;
  }
  ancestors.push_back(node);
  for (int i = 1; i <= node->GetNbChildren(); ++i)
    Walk(node->GetChildren()[i], ancestors, seen, samples);
  ancestors.pop_back();
}

std::map<const RKMBVHNodeConst *, int>
LeavesOf(const TreeRef &tree, const std::map<const RKMBVHNodeConst *, std::vector<RKMMathPoint>> &samples = {})
{
  std::map<const RKMBVHNodeConst *, int> seen;
  std::vector<const RKMBVHNodeConst *> ancestors;
  if (tree && tree->GetRoot())
    Walk(tree->GetRoot(), ancestors, seen, samples);
  return seen;
}

std::vector<int> IdsInOrder(RKMBVHTreeSet &set)
{
  std::vector<int> ids;
  for (set.Begin(); !set.End(); ++set)
    ids.push_back(RKMBVHTreeSet::GetObjectId(**set));
  return ids;
}
}

TEST(RKMBVHTreeSetTest, AddTreeMakesOnePlacedLeafAndTakesOneReference)
{
  RKMBVHTreeSet set;
  TreeRef plain = MakeObject(0, true), moved = MakeObject(0);
  const RKMMathTransformation shift(RKMMathVector(10, 0, 0));
  EXPECT_EQ(set.AddTree(1, plain.Get(), nullptr), S_OK);
  EXPECT_EQ(set.AddTree(2, moved.Get(), &shift), S_OK);
  EXPECT_EQ(plain->GetRefCount(), 2);
  EXPECT_EQ(moved->GetRefCount(), 2);

  const RKMBVHNodeConst *leaf1 = NodeOf(set, 1);
  ASSERT_NE(leaf1, nullptr);
  EXPECT_EQ(leaf1->GetNbChildren(), 0);
  EXPECT_EQ(RKMBVHTreeSet::GetTree(*leaf1), plain.Get());
  EXPECT_EQ(RKMBVHTreeSet::GetObjectId(*leaf1), 1);
  EXPECT_TRUE(RKMBVHTreeSet::IsActivated(*leaf1));
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*leaf1).IsIdentity());
  // Without placement the leaf's volumes are clones of the root's, not the root's own.
  const RKMBVHNodeConst *root = plain->GetRoot();
  EXPECT_NE(leaf1->GetFirstBoundingVolume(), root->GetFirstBoundingVolume());
  EXPECT_NE(leaf1->GetSecondBoundingVolume(), root->GetSecondBoundingVolume());
  ASSERT_NE(leaf1->GetFirstBoundingVolume(), nullptr);
  EXPECT_EQ(leaf1->GetFirstBoundingVolume()->GetTypeID(), RKMPolyBoundingVolume::TypeAABB);
  EXPECT_TRUE(Inside(leaf1->GetFirstBoundingVolume(), RKMMathPoint(1, 1, 1)));
  EXPECT_FALSE(Inside(leaf1->GetFirstBoundingVolume(), RKMMathPoint(1.5, 1.5, 1.5)));
  EXPECT_TRUE(Inside(leaf1->GetSecondBoundingVolume(), RKMMathPoint(1.5, 1.5, 1.5)));

  const RKMBVHNodeConst *leaf2 = NodeOf(set, 2);
  ASSERT_NE(leaf2, nullptr);
  EXPECT_EQ(leaf2->GetSecondBoundingVolume(), nullptr);
  EXPECT_TRUE(Inside(leaf2->GetFirstBoundingVolume(), RKMMathPoint(10.5, 0.5, 0.5)));
  EXPECT_FALSE(Inside(leaf2->GetFirstBoundingVolume(), RKMMathPoint(0.5, 0.5, 0.5)));
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*leaf2) == shift);
  ASSERT_NE(RKMBVHTreeSet::GetTransformation(*leaf2), nullptr);
  EXPECT_TRUE(*RKMBVHTreeSet::GetTransformation(*leaf2) == shift);
  // The object trees themselves are left where they are.
  EXPECT_TRUE(Inside(moved->GetRoot()->GetFirstBoundingVolume(), RKMMathPoint(0.5, 0.5, 0.5)));
}

TEST(RKMBVHTreeSetTest, PlacementKeepsScalingsAndSnapsOtherMatricesToIsometries)
{
  RKMBVHTreeSet set;
  const RKMMathTransformation scaling(RKMMath3x3Matrix(2, 0, 0, 0, 2, 0, 0, 0, 2), RKMMathVector(0, 0, 0));
  // The nearest isometry to diag(2, 1, 1) is the identity: the stretch along x must disappear.
  const RKMMathTransformation stretch(RKMMath3x3Matrix(2, 0, 0, 0, 1, 0, 0, 0, 1), RKMMathVector(0, 5, 0));
  ASSERT_EQ(set.AddTree(1, MakeObject(0).Get(), &scaling), S_OK);
  ASSERT_EQ(set.AddTree(2, MakeObject(0).Get(), &stretch), S_OK);

  const RKMBVHNodeConst *scaled = NodeOf(set, 1), *snapped = NodeOf(set, 2);
  ASSERT_TRUE(scaled && snapped);
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*scaled) == scaling);
  EXPECT_TRUE(Inside(scaled->GetFirstBoundingVolume(), RKMMathPoint(1.9, 1.9, 1.9)));

  const RKMMathTransformation &p = RKMBVHTreeSet::GetPosition(*snapped);
  for (int r = 0; r < 3; ++r)
    for (int c = 0; c < 3; ++c)
      EXPECT_NEAR(p.GetMatrix()(r, c), r == c ? 1.0 : 0.0, 1e-12);
  EXPECT_DOUBLE_EQ(p.GetTranslation().y, 5.0);
  EXPECT_TRUE(Inside(snapped->GetFirstBoundingVolume(), RKMMathPoint(0.9, 5.5, 0.5)));
  EXPECT_FALSE(Inside(snapped->GetFirstBoundingVolume(), RKMMathPoint(1.8, 5.5, 0.5)));
}

TEST(RKMBVHTreeSetTest, AddTreeRejectsNullAndRootlessTreesAndKeepsTheFirstLeafOfAnId)
{
  RKMBVHTreeSet set;
  EXPECT_EQ(set.AddTree(1, nullptr, nullptr), E_INVALIDARG);
  TreeRef empty = Adopt(new RKMBVHTree(nullptr));
  EXPECT_EQ(set.AddTree(1, empty.Get(), nullptr), E_FAIL);
  EXPECT_EQ(empty->GetRefCount(), 1);
  EXPECT_TRUE(IdsInOrder(set).empty());
  EXPECT_EQ(NodeOf(set, 1), nullptr);
  EXPECT_EQ(Adopt(set.GetTree()).Get(), nullptr);

  TreeRef first = MakeObject(0), second = MakeObject(5);
  ASSERT_EQ(set.AddTree(7, first.Get(), nullptr), S_OK);
  EXPECT_EQ(set.AddTree(7, second.Get(), nullptr), E_FAIL);
  const RKMBVHNodeConst *kept = NodeOf(set, 7);
  ASSERT_NE(kept, nullptr);
  EXPECT_EQ(RKMBVHTreeSet::GetTree(*kept), first.Get());
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{7, 7}));

  TreeRef overall = Adopt(set.GetTree());
  ASSERT_NE(overall.Get(), nullptr);
  const auto leaves = LeavesOf(overall);
  EXPECT_EQ(leaves.size(), 2u);
  EXPECT_EQ(leaves.count(kept), 1u);

  // The refused duplicate still holds its tree until the set goes.
  EXPECT_EQ(second->GetRefCount(), 2);
}

TEST(RKMBVHTreeSetTest, OverallTreeIsSharedUntilAChangeDropsIt)
{
  RKMBVHTreeSet set;
  std::map<const RKMBVHNodeConst *, std::vector<RKMMathPoint>> samples;
  const double xs[] = {0, 3, 40, -20, 7};
  for (int id = 0; id < 5; ++id)
  {
    const RKMMathTransformation shift(RKMMathVector(0, id * 4.0, 0));
    ASSERT_EQ(set.AddTree(id, MakeObject(xs[id]).Get(), &shift), S_OK);
    const double y = id * 4.0;
    samples[NodeOf(set, id)] = {RKMMathPoint(xs[id], y, 0), RKMMathPoint(xs[id] + 1, y + 1, 1),
                                RKMMathPoint(xs[id] + 0.5, y + 0.5, 0.5)};
  }

  TreeRef t1 = Adopt(set.GetTree()), t2 = Adopt(set.GetTree());
  ASSERT_NE(t1.Get(), nullptr);
  EXPECT_EQ(t1.Get(), t2.Get());
  EXPECT_EQ(t1->GetRefCount(), 3);
  const auto leaves = LeavesOf(t1, samples);
  EXPECT_EQ(leaves.size(), 5u);
  for (const auto &entry : samples)
    EXPECT_EQ(leaves.count(entry.first) ? leaves.at(entry.first) : 0, 1);
  t2.Reset();

  // The holder keeps a valid, rootless tree; the object leaves outlive it.
  EXPECT_EQ(set.DesactivateTree(3), S_OK);
  EXPECT_EQ(t1->GetRoot(), nullptr);
  EXPECT_EQ(t1->GetRefCount(), 1);
  t1.Reset();
  const RKMBVHNodeConst *leaf0 = NodeOf(set, 0);
  ASSERT_NE(leaf0, nullptr);
  EXPECT_TRUE(Inside(leaf0->GetFirstBoundingVolume(), RKMMathPoint(0.5, 0.5, 0.5)));

  TreeRef t3 = Adopt(set.GetTree());
  ASSERT_NE(t3.Get(), nullptr);
  EXPECT_FALSE(RKMBVHTreeSet::IsActivated(*NodeOf(set, 3)));
  const auto active = LeavesOf(t3, samples);
  EXPECT_EQ(active.size(), 4u);
  EXPECT_EQ(active.count(NodeOf(set, 3)), 0u);
}

TEST(RKMBVHTreeSetTest, EveryChangeDropsTheOverallTree)
{
  const RKMMathTransformation shift(RKMMathVector(1, 2, 3));
  const std::vector<std::pair<const char *, std::function<void(RKMBVHTreeSet &)>>> changes = {
      {"add", [](RKMBVHTreeSet &s) { s.AddTree(3, MakeObject(9).Get(), nullptr); }},
      {"remove", [](RKMBVHTreeSet &s) { s.RemoveTree(2); }},
      {"move", [&shift](RKMBVHTreeSet &s) { s.ModifyTreePosition(1, &shift); }},
      {"off", [](RKMBVHTreeSet &s) { s.DesactivateTree(1); }},
      {"on", [](RKMBVHTreeSet &s) { s.ActivateTree(1); }},
      {"off unknown", [](RKMBVHTreeSet &s) { EXPECT_EQ(s.DesactivateTree(99), E_INVALIDARG); }},
      {"on unknown", [](RKMBVHTreeSet &s) { EXPECT_EQ(s.ActivateTree(99), E_INVALIDARG); }},
      {"all off", [](RKMBVHTreeSet &s) { s.DeactivateAll(); }},
      {"all on", [](RKMBVHTreeSet &s) { s.ActivateAll(); }},
  };
  for (const auto &change : changes)
  {
    RKMBVHTreeSet set;
    for (int id = 1; id <= 2; ++id)
      ASSERT_EQ(set.AddTree(id, MakeObject(id * 3.0).Get(), nullptr), S_OK);
    const TreeRef before = Adopt(set.GetTree());
    ASSERT_NE(before.Get(), nullptr) << change.first;
    change.second(set);
    EXPECT_EQ(before->GetRoot(), nullptr) << change.first;
    if (const TreeRef after = Adopt(set.GetTree()))
    {
      EXPECT_NE(after.Get(), before.Get()) << change.first;
      EXPECT_NE(after->GetRoot(), nullptr) << change.first;
    }
  }
}

TEST(RKMBVHTreeSetTest, ActivationDecidesWhichLeavesTheOverallTreeHolds)
{
  RKMBVHTreeSet set;
  TreeRef a = MakeObject(0), b = MakeObject(4);
  ASSERT_EQ(set.AddTree(1, a.Get(), nullptr), S_OK);
  TreeRef single = Adopt(set.GetTree());
  ASSERT_NE(single.Get(), nullptr);
  EXPECT_EQ(single->GetRoot(), NodeOf(set, 1));
  single.Reset();

  ASSERT_EQ(set.AddTree(2, b.Get(), nullptr), S_OK);
  EXPECT_EQ(set.DeactivateAll(), S_OK);
  EXPECT_FALSE(RKMBVHTreeSet::IsActivated(*NodeOf(set, 1)));
  EXPECT_EQ(Adopt(set.GetTree()).Get(), nullptr);
  EXPECT_EQ(set.ActivateTree(2), S_OK);
  TreeRef only = Adopt(set.GetTree());
  ASSERT_NE(only.Get(), nullptr);
  EXPECT_EQ(only->GetRoot(), NodeOf(set, 2));
  only.Reset();
  EXPECT_EQ(set.ActivateAll(), S_OK);
  EXPECT_EQ(LeavesOf(Adopt(set.GetTree())).size(), 2u);
}

TEST(RKMBVHTreeSetTest, RemoveFlushAndMoveReachTheObjectTree)
{
  RKMBVHTreeSet set;
  TreeRef a = MakeObject(0), b = MakeObject(5, true);
  const RKMRef<TreeSpy> spyA = Adopt(new TreeSpy);
  TreeSpy *spyB = new TreeSpy;
  a->RegisterObserver(spyA.Get());
  b->RegisterObserver(spyB);
  spyB->Release();  // b now holds spyB's only reference
  ASSERT_EQ(set.AddTree(1, a.Get(), nullptr), S_OK);
  ASSERT_EQ(set.AddTree(2, b.Get(), nullptr), S_OK);
  a.Reset();

  EXPECT_EQ(set.FlushTree(1), S_OK);
  EXPECT_EQ(spyA->flushes.load(), 1);
  EXPECT_EQ(set.FlushTree(42), E_INVALIDARG);

  const RKMMathTransformation up(RKMMathVector(0, 0, 10));
  EXPECT_EQ(set.ModifyTreePosition(2, &up), S_OK);
  const RKMBVHNodeConst *leaf2 = NodeOf(set, 2);
  EXPECT_TRUE(Inside(leaf2->GetFirstBoundingVolume(), RKMMathPoint(5.5, 0.5, 10.5)));
  EXPECT_FALSE(Inside(leaf2->GetFirstBoundingVolume(), RKMMathPoint(5.5, 0.5, 0.5)));
  EXPECT_TRUE(Inside(leaf2->GetSecondBoundingVolume(), RKMMathPoint(6.5, 1.5, 11.5)));
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*leaf2) == up);
  EXPECT_EQ(set.ModifyTreePosition(2, nullptr), S_OK);
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*leaf2).IsIdentity());
  EXPECT_TRUE(Inside(leaf2->GetFirstBoundingVolume(), RKMMathPoint(5.5, 0.5, 0.5)));
  EXPECT_EQ(set.ModifyTreePosition(42, &up), E_INVALIDARG);

  // Held only by the set, tree 1 dies with its removal.
  EXPECT_EQ(set.RemoveTree(1), S_OK);
  EXPECT_EQ(spyA->deletions.load(), 1);
  EXPECT_EQ(NodeOf(set, 1), nullptr);
  EXPECT_EQ(set.RemoveTree(1), E_INVALIDARG);
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{2}));

  // b is still ours too: the set's destruction releases only its own reference.
  EXPECT_EQ(b->GetRefCount(), 2);
  {
    RKMBVHTreeSet other;
    ASSERT_EQ(other.AddTree(1, b.Get(), nullptr), S_OK);
    EXPECT_EQ(b->GetRefCount(), 3);
  }
  EXPECT_EQ(b->GetRefCount(), 2);
  EXPECT_EQ(spyB->deletions.load(), 0);
}

TEST(RKMBVHTreeSetTest, StaticAccessorsOnANodeWithoutAttribute)
{
  RKMBVHNode plain;
  EXPECT_TRUE(RKMBVHTreeSet::IsActivated(plain));
  EXPECT_EQ(RKMBVHTreeSet::GetObjectId(plain), -1);
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(plain).IsIdentity());
  EXPECT_EQ(RKMBVHTreeSet::GetTransformation(plain), nullptr);
  EXPECT_EQ(RKMBVHTreeSet::GetTree(plain), nullptr);
  RKMBVHTreeSet set;
  const RKMBVHNodeConst *node = &plain;
  EXPECT_EQ(set.GetObjectNode(1, node), E_FAIL);
}

TEST(RKMBVHTreeSetTest, IterationFollowsOrderOfAddition)
{
  RKMBVHTreeSet set;
  for (int id : {5, 1, 3, 9})
    ASSERT_EQ(set.AddTree(id, MakeObject(id).Get(), nullptr), S_OK);
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{5, 1, 3, 9}));
  ASSERT_EQ(set.RemoveTree(1), S_OK);
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{5, 3, 9}));
  // Begin restarts a walk that ran to its end.
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{5, 3, 9}));
}

TEST(RKMBVHTreeSetTest, ObserversHearEveryChangeFirstAndInOrder)
{
  std::vector<std::string> journal;
  auto set = std::make_unique<RKMBVHTreeSet>();
  const auto a = Adopt(new SetSpy(&journal, "A", 3)), b = Adopt(new SetSpy(&journal, "B", 5));
  EXPECT_EQ(set->CheckPoint(), -1);
  set->RegisterObserver(a.Get());
  set->RegisterObserver(b.Get());
  set->RegisterObserver(a.Get());  // already there: no second entry
  RKMBVHTreeSet *s = set.get();
  a->hook = [s](SetSpy &, const std::string &what, int id) {
    // Nothing has changed yet when observers hear of it.
    if (what == "add")
    {
      EXPECT_EQ(NodeOf(*s, id), nullptr);
    }
    if (what == "remove" || what == "vremove")
    {
      EXPECT_EQ(NodeOf(*s, id) != nullptr, id == 1);
    }
  };
  const int countA = a->GetRefCount();

  const TreeRef t = MakeObject(0);
  EXPECT_EQ(set->AddTree(1, t.Get(), nullptr), S_OK);
  EXPECT_EQ(set->AddTree(2, nullptr, nullptr), E_INVALIDARG);
  set->ModifyTreePosition(1, nullptr);
  set->DesactivateTree(1);
  set->ActivateTree(1);
  set->DeactivateAll();
  set->ActivateAll();
  set->FlushTree(1);
  EXPECT_EQ(set->CheckPoint(), 1);
  EXPECT_EQ(set->RemoveTree(1), S_OK);
  EXPECT_EQ(set->RemoveTree(8), E_INVALIDARG);
  const std::vector<std::string> expected = {
      "A add 1",    "B add 1",    "A add 2",      "B add 2",      "A move 1",    "B move 1",
      "A off 1",    "B off 1",    "A on 1",       "B on 1",       "A alloff 0",  "B alloff 0",
      "A allon 0",  "B allon 0",  "A flush 1",    "B flush 1",    "A check 0",   "B check 0",
      "A remove 1", "B remove 1", "A vremove 1",  "B vremove 1",  "A remove 8",  "B remove 8",
      "A vremove 8", "B vremove 8"};
  EXPECT_EQ(journal, expected);
  EXPECT_EQ(a->GetRefCount(), countA);

  // Destruction releases each observer once, without a word to it, and releases the object tree.
  const TreeRef again = t;
  EXPECT_EQ(set->AddTree(4, t.Get(), nullptr), S_OK);
  EXPECT_EQ(t->GetRefCount(), 3);
  journal.clear();
  set.reset();
  EXPECT_TRUE(journal.empty());
  EXPECT_EQ(a->GetRefCount(), countA - 1);
  EXPECT_EQ(b->GetRefCount(), 1);
  EXPECT_EQ(t->GetRefCount(), 2);
}

TEST(RKMBVHTreeSetTest, ObserverMayUnregisterItselfDuringANotification)
{
  std::vector<std::string> journal;
  RKMBVHTreeSet set;
  SetSpy *a = new SetSpy(&journal, "A"), *b = new SetSpy(&journal, "B"), *c = new SetSpy(&journal, "C");
  set.RegisterObserver(a);
  set.RegisterObserver(b);
  set.RegisterObserver(c);
  // From now on the set holds the only references: b's call must keep it alive after it leaves the chain.
  a->Release();
  b->Release();
  c->Release();
  b->hook = [&set](SetSpy &self, const std::string &, int) {
    set.UnregisterObserver(&self);
    set.UnregisterObserver(&self);
  };
  set.DeactivateAll();
  set.ActivateAll();
  EXPECT_EQ(journal, (std::vector<std::string>{"A alloff 0", "B alloff 0", "C alloff 0", "A allon 0", "C allon 0"}));
}

TEST(RKMBVHTreeSetTest, ConcurrentGetTreeBuildsOnce)
{
  RKMBVHTreeSet set;
  for (int id = 0; id < 12; ++id)
    ASSERT_EQ(set.AddTree(id, MakeObject(id * 2.0).Get(), nullptr), S_OK);
  constexpr int kThreads = 6;
  for (int round = 0; round < 3; ++round)
  {
    const RKMMathTransformation shift(RKMMathVector(0, round, 0));
    ASSERT_EQ(set.ModifyTreePosition(round, &shift), S_OK);
    std::atomic<int> ready{0};
    std::vector<TreeRef> got(kThreads);
    std::vector<std::thread> threads;
    for (int i = 0; i < kThreads; ++i)
      threads.emplace_back([&, i] {
        ++ready;
        while (ready.load() < kThreads)
          std::this_thread::yield();
        got[static_cast<size_t>(i)] = Adopt(set.GetTree());
      });
    for (std::thread &th : threads)
      th.join();
    ASSERT_NE(got[0].Get(), nullptr);
    for (const TreeRef &t : got)
      EXPECT_EQ(t.Get(), got[0].Get());
    EXPECT_EQ(got[0]->GetRefCount(), kThreads + 1);
    EXPECT_EQ(LeavesOf(got[0]).size(), 12u);
  }
}
