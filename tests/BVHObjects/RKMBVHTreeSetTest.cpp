#include "RKMBVHTreeSet.h"
#include "BVHTestTrees.h"
#include "RKMBVHTreeSetObserver.h"
#include "RKMMath3x3Matrix.h"
#include "RKMMathTransformation.h"

#include <gtest/gtest.h>

#include <memory>
#include <set>
#include <thread>
#include <type_traits>

static_assert(!std::is_copy_constructible<RKMBVHTreeSet>::value, "a set owns its leaves");
static_assert(!std::is_copy_assignable<RKMBVHTreeSet>::value, "a set owns its leaves");

namespace
{
using namespace bvhtest;
using TreeRef = RKMRef<RKMBVHTree>;

// Holds a reference the caller already owns.
template <class T> RKMRef<T> Adopt(T *object) { return RKMRef<T>::Adopt(object); }

// An object tree over the box [x, x+1] × [0,1] × [0,1], optionally with a second volume on the root.
TreeRef MakeObject(double x, bool withSecond = false)
{
  RKMBVHNode *root = new RKMBVHNode(new RKMPolyAABB(RKMMathBox(x, x + 1, 0, 1, 0, 1)));
  if (withSecond)
    root->SetSecondBoundingVolume(new RKMPolyAABB(RKMMathBox(x, x + 2, 0, 2, 0, 2)));
  root->AbsorbChild(new RKMBVHNode(new RKMPolyAABB(RKMMathBox(x, x + 0.5, 0, 0.5, 0, 0.5))));
  return MakeTree(root);
}

bool Inside(const RKMPolyBoundingVolume *bv, const RKMMathPoint &p)
{
  return bv && RKMPolyBVProperties::IsPointInsideBV(*bv, p);
}

NodeC NodeOf(const RKMBVHTreeSet &set, int id)
{
  NodeC node = nullptr;
  return set.GetObjectNode(id, node) == S_OK ? node : nullptr;
}

// The leaves of an overall tree, each reached once under parents that enclose it.
std::set<NodeC> LeavesOf(const TreeRef &tree)
{
  Rng g(7);
  if (!tree || !tree->GetRoot())
    return {};
  const std::vector<NodeC> leaves = CheckHierarchy(tree->GetRoot(), g).Leaves();
  return std::set<NodeC>(leaves.begin(), leaves.end());
}

std::vector<int> IdsInOrder(RKMBVHTreeSet &set)
{
  std::vector<int> ids;
  for (set.Begin(); !set.End(); ++set)
    ids.push_back(RKMBVHTreeSet::GetObjectId(**set));
  return ids;
}

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
  int OnCheckPoint() override { return Log("check", 0), m_answer; }
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
} // namespace

// Without placement, with a translation, a scaling (kept) and a stretch (snapped to its nearest
// isometry, the identity, keeping the translation).
TEST(RKMBVHTreeSetTest, AddTreeMakesOnePlacedLeafPerTreeAndTakesOneReference)
{
  const RKMMathTransformation shift(RKMMathVector(10, 0, 0));
  const RKMMathTransformation scaling(RKMMath3x3Matrix(2, 0, 0, 0, 2, 0, 0, 0, 2), RKMMathVector(0, 0, 0));
  const RKMMathTransformation stretch(RKMMath3x3Matrix(2, 0, 0, 0, 1, 0, 0, 0, 1), RKMMathVector(0, 5, 0));
  struct Case
  {
    const RKMMathTransformation *given;
    RKMMathTransformation expected;
    std::vector<RKMMathPoint> in, out;
  };
  const Case cases[] = {
      {nullptr, RKMMathTransformation(), {{1, 1, 1}}, {{1.5, 1.5, 1.5}}},
      {&shift, shift, {{10.5, 0.5, 0.5}}, {{0.5, 0.5, 0.5}}},
      {&scaling, scaling, {{1.9, 1.9, 1.9}}, {}},
      {&stretch, RKMMathTransformation(RKMMathVector(0, 5, 0)), {{0.9, 5.5, 0.5}}, {{1.8, 5.5, 0.5}}}};
  RKMBVHTreeSet set;
  std::vector<TreeRef> trees;
  for (int id = 0; id < 4; ++id)
  {
    trees.push_back(MakeObject(0, id == 0));
    ASSERT_EQ(set.AddTree(id, trees.back().Get(), cases[id].given), S_OK);
  }
  for (int id = 0; id < 4; ++id)
  {
    SCOPED_TRACE("tree " + std::to_string(id));
    const NodeC leaf = NodeOf(set, id), root = trees[id]->GetRoot();
    ASSERT_NE(leaf, nullptr);
    EXPECT_EQ(trees[id]->GetRefCount(), 2);
    EXPECT_TRUE(leaf->GetNbChildren() == 0 && RKMBVHTreeSet::GetTree(*leaf) == trees[id].Get() &&
                RKMBVHTreeSet::GetObjectId(*leaf) == id && RKMBVHTreeSet::IsActivated(*leaf) &&
                RKMBVHTreeSet::GetTransformation(*leaf) == &RKMBVHTreeSet::GetPosition(*leaf));
    const RKMMathTransformation &p = RKMBVHTreeSet::GetPosition(*leaf), &e = cases[id].expected;
    for (int r = 0; r < 3; ++r)
    {
      EXPECT_NEAR(p.GetTranslation()[r], e.GetTranslation()[r], 1e-12);
      for (int c = 0; c < 3; ++c)
        EXPECT_NEAR(p.GetMatrix()(r, c), e.GetMatrix()(r, c), 1e-12);
    }
    // The leaf's volumes are placed clones of the root's; the object tree stays where it is.
    ASSERT_NE(leaf->GetFirstBoundingVolume(), nullptr);
    EXPECT_NE(leaf->GetFirstBoundingVolume(), root->GetFirstBoundingVolume());
    EXPECT_EQ(leaf->GetSecondBoundingVolume() != nullptr, id == 0);
    for (const RKMMathPoint &q : cases[id].in)
      EXPECT_TRUE(Inside(leaf->GetFirstBoundingVolume(), q));
    for (const RKMMathPoint &q : cases[id].out)
      EXPECT_FALSE(Inside(leaf->GetFirstBoundingVolume(), q));
    EXPECT_TRUE(Inside(root->GetFirstBoundingVolume(), RKMMathPoint(0.5, 0.5, 0.5)));
  }
  const NodeC first = NodeOf(set, 0);
  EXPECT_EQ(first->GetFirstBoundingVolume()->GetTypeID(), RKMPolyBoundingVolume::TypeAABB);
  EXPECT_NE(first->GetSecondBoundingVolume(), trees[0]->GetRoot()->GetSecondBoundingVolume());
  EXPECT_TRUE(Inside(first->GetSecondBoundingVolume(), RKMMathPoint(1.5, 1.5, 1.5)));
}

TEST(RKMBVHTreeSetTest, AddTreeRejectsNullAndRootlessTreesAndKeepsTheFirstLeafOfAnId)
{
  RKMBVHTreeSet set;
  EXPECT_EQ(set.AddTree(1, nullptr, nullptr), E_INVALIDARG);
  TreeRef empty = MakeTree(nullptr);
  EXPECT_EQ(set.AddTree(1, empty.Get(), nullptr), E_FAIL);
  EXPECT_EQ(empty->GetRefCount(), 1);
  EXPECT_TRUE(IdsInOrder(set).empty());
  EXPECT_EQ(NodeOf(set, 1), nullptr);
  EXPECT_EQ(Adopt(set.GetTree()).Get(), nullptr);

  TreeRef first = MakeObject(0), second = MakeObject(5);
  ASSERT_EQ(set.AddTree(7, first.Get(), nullptr), S_OK);
  EXPECT_EQ(set.AddTree(7, second.Get(), nullptr), E_FAIL);
  const NodeC kept = NodeOf(set, 7);
  ASSERT_NE(kept, nullptr);
  EXPECT_EQ(RKMBVHTreeSet::GetTree(*kept), first.Get());
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{7, 7}));
  const std::set<NodeC> leaves = LeavesOf(Adopt(set.GetTree()));
  EXPECT_EQ(leaves.size(), 2u);
  EXPECT_EQ(leaves.count(kept), 1u);
  // The refused duplicate still holds its tree until the set goes.
  EXPECT_EQ(second->GetRefCount(), 2);
}

TEST(RKMBVHTreeSetTest, IterationFollowsOrderOfAdditionAndAccessorsSkipForeignNodes)
{
  RKMBVHTreeSet set;
  for (int id : {5, 1, 3, 9})
    ASSERT_EQ(set.AddTree(id, MakeObject(id).Get(), nullptr), S_OK);
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{5, 1, 3, 9}));
  ASSERT_EQ(set.RemoveTree(1), S_OK);
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{5, 3, 9}));
  // Begin restarts a walk that ran to its end.
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{5, 3, 9}));

  RKMBVHNode plain;
  EXPECT_TRUE(RKMBVHTreeSet::IsActivated(plain) && RKMBVHTreeSet::GetObjectId(plain) == -1 &&
              RKMBVHTreeSet::GetPosition(plain).IsIdentity() && !RKMBVHTreeSet::GetTransformation(plain) &&
              !RKMBVHTreeSet::GetTree(plain));
  NodeC node = &plain;
  EXPECT_EQ(set.GetObjectNode(1, node), E_FAIL);
}

TEST(RKMBVHTreeSetTest, OverallTreeHoldsTheActiveLeavesAndIsSharedUntilAChange)
{
  RKMBVHTreeSet set;
  const double xs[] = {0, 3, 40, -20, 7};
  for (int id = 0; id < 5; ++id)
  {
    const RKMMathTransformation shift(RKMMathVector(0, id * 4.0, 0));
    ASSERT_EQ(set.AddTree(id, MakeObject(xs[id]).Get(), &shift), S_OK);
  }
  const auto leaves = [&set](std::vector<int> ids)
  {
    std::set<NodeC> nodes;
    return std::for_each(ids.begin(), ids.end(), [&](int id) { nodes.insert(NodeOf(set, id)); }), nodes;
  };
  TreeRef t1 = Adopt(set.GetTree()), t2 = Adopt(set.GetTree());
  ASSERT_NE(t1.Get(), nullptr);
  EXPECT_EQ(t1.Get(), t2.Get());
  EXPECT_EQ(t1->GetRefCount(), 3);
  EXPECT_EQ(LeavesOf(t1), leaves({0, 1, 2, 3, 4}));
  t2.Reset();

  // The holder keeps a valid, rootless tree; the object leaves outlive it.
  EXPECT_EQ(set.DesactivateTree(3), S_OK);
  EXPECT_EQ(t1->GetRoot(), nullptr);
  EXPECT_EQ(t1->GetRefCount(), 1);
  t1.Reset();
  EXPECT_TRUE(Inside(NodeOf(set, 0)->GetFirstBoundingVolume(), RKMMathPoint(0.5, 0.5, 0.5)));
  EXPECT_FALSE(RKMBVHTreeSet::IsActivated(*NodeOf(set, 3)));
  EXPECT_EQ(LeavesOf(Adopt(set.GetTree())), leaves({0, 1, 2, 4}));

  // None active gives no tree; a single active leaf is the root.
  EXPECT_EQ(set.DeactivateAll(), S_OK);
  EXPECT_FALSE(RKMBVHTreeSet::IsActivated(*NodeOf(set, 1)));
  EXPECT_EQ(Adopt(set.GetTree()).Get(), nullptr);
  EXPECT_EQ(set.ActivateTree(2), S_OK);
  TreeRef only = Adopt(set.GetTree());
  ASSERT_NE(only.Get(), nullptr);
  EXPECT_EQ(only->GetRoot(), NodeOf(set, 2));
  only.Reset();
  EXPECT_EQ(set.ActivateAll(), S_OK);
  EXPECT_EQ(LeavesOf(Adopt(set.GetTree())), leaves({0, 1, 2, 3, 4}));
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

TEST(RKMBVHTreeSetTest, RemoveFlushAndMoveReachTheObjectTree)
{
  Journal journal;
  RKMBVHTreeSet set;
  TreeRef a = MakeObject(0), b = MakeObject(5, true);
  a->RegisterObserver(Adopt(new TreeWatcher(&journal, "a")).Get());
  b->RegisterObserver(Adopt(new TreeWatcher(&journal, "b")).Get());
  ASSERT_EQ(set.AddTree(1, a.Get(), nullptr), S_OK);
  ASSERT_EQ(set.AddTree(2, b.Get(), nullptr), S_OK);
  a.Reset();
  EXPECT_EQ(set.FlushTree(1), S_OK);
  EXPECT_EQ(set.FlushTree(42), E_INVALIDARG);
  EXPECT_EQ(journal.entries, std::vector<std::string>{"a flush"});

  const RKMMathTransformation up(RKMMathVector(0, 0, 10));
  EXPECT_EQ(set.ModifyTreePosition(2, &up), S_OK);
  const NodeC leaf2 = NodeOf(set, 2);
  const RKMPolyBoundingVolume *first = leaf2->GetFirstBoundingVolume();
  EXPECT_TRUE(Inside(first, RKMMathPoint(5.5, 0.5, 10.5)) && !Inside(first, RKMMathPoint(5.5, 0.5, 0.5)));
  EXPECT_TRUE(Inside(leaf2->GetSecondBoundingVolume(), RKMMathPoint(6.5, 1.5, 11.5)));
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*leaf2) == up);
  EXPECT_EQ(set.ModifyTreePosition(2, nullptr), S_OK);
  EXPECT_TRUE(RKMBVHTreeSet::GetPosition(*leaf2).IsIdentity());
  EXPECT_TRUE(Inside(leaf2->GetFirstBoundingVolume(), RKMMathPoint(5.5, 0.5, 0.5)));
  EXPECT_EQ(set.ModifyTreePosition(42, &up), E_INVALIDARG);

  // Held only by the set, tree 1 dies with its removal, and its watcher with it.
  EXPECT_EQ(set.RemoveTree(1), S_OK);
  EXPECT_EQ(journal.entries, (std::vector<std::string>{"a flush", "a deletion"}));
  EXPECT_TRUE(journal.deaths.load() == 1 && !NodeOf(set, 1));
  EXPECT_EQ(set.RemoveTree(1), E_INVALIDARG);
  EXPECT_EQ(IdsInOrder(set), (std::vector<int>{2}));

  // b is still ours too: a set's destruction releases only its own reference.
  EXPECT_EQ(b->GetRefCount(), 2);
  {
    RKMBVHTreeSet other;
    ASSERT_EQ(other.AddTree(1, b.Get(), nullptr), S_OK);
    EXPECT_EQ(b->GetRefCount(), 3);
  }
  EXPECT_EQ(b->GetRefCount(), 2);
  EXPECT_EQ(journal.entries.size(), 2u);
}

TEST(RKMBVHTreeSetTest, ObserversHearEveryChangeFirstAndInOrder)
{
  std::vector<std::string> journal;
  auto set = std::make_unique<RKMBVHTreeSet>();
  const auto a = Adopt(new SetSpy(&journal, "A", 3)), b = Adopt(new SetSpy(&journal, "B", 5));
  EXPECT_EQ(set->CheckPoint(), -1);
  set->RegisterObserver(a.Get());
  set->RegisterObserver(b.Get());
  set->RegisterObserver(a.Get()); // already there: no second entry
  RKMBVHTreeSet *s = set.get();
  // Nothing has changed yet when observers hear of it.
  a->hook = [s](SetSpy &, const std::string &what, int id)
  {
    EXPECT_TRUE(what != "add" || !NodeOf(*s, id));
    EXPECT_TRUE((what != "remove" && what != "vremove") || (NodeOf(*s, id) != nullptr) == (id == 1));
  };
  const int countA = a->GetRefCount();
  const TreeRef t = MakeObject(0);
  EXPECT_EQ(set->AddTree(1, t.Get(), nullptr), S_OK);
  EXPECT_EQ(set->AddTree(2, nullptr, nullptr), E_INVALIDARG);
  set->ModifyTreePosition(1, nullptr), set->DesactivateTree(1), set->ActivateTree(1);
  set->DeactivateAll(), set->ActivateAll(), set->FlushTree(1);
  EXPECT_EQ(set->CheckPoint(), 1);
  EXPECT_EQ(set->RemoveTree(1), S_OK);
  EXPECT_EQ(set->RemoveTree(8), E_INVALIDARG);
  std::vector<std::string> expected;
  for (const char *call : {"add 1", "add 2", "move 1", "off 1", "on 1", "alloff 0", "allon 0", "flush 1", "check 0",
                           "remove 1", "vremove 1", "remove 8", "vremove 8"})
    expected.insert(expected.end(), {std::string("A ") + call, std::string("B ") + call});
  EXPECT_EQ(journal, expected);
  EXPECT_EQ(a->GetRefCount(), countA);

  // Destruction releases each observer once, without a word to it, and releases the object tree.
  EXPECT_EQ(set->AddTree(4, t.Get(), nullptr), S_OK);
  EXPECT_EQ(t->GetRefCount(), 2);
  journal.clear();
  set.reset();
  EXPECT_TRUE(journal.empty());
  EXPECT_TRUE(a->GetRefCount() == countA - 1 && b->GetRefCount() == 1 && t->GetRefCount() == 1);
}

TEST(RKMBVHTreeSetTest, ObserverMayUnregisterItselfDuringANotification)
{
  std::vector<std::string> journal;
  RKMBVHTreeSet set;
  SetSpy *spies[] = {new SetSpy(&journal, "A"), new SetSpy(&journal, "B"), new SetSpy(&journal, "C")};
  // The set holds the only references: B's call must keep B alive after it leaves the chain.
  for (SetSpy *spy : spies)
    set.RegisterObserver(spy), spy->Release();
  spies[1]->hook = [&set](SetSpy &self, const std::string &, int)
  {
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
      threads.emplace_back(
          [&, i]
          {
            ++ready;
            while (ready.load() < kThreads)
              std::this_thread::yield();
            got[static_cast<size_t>(i)] = Adopt(set.GetTree());
          });
    for (std::thread &th : threads)
      th.join();
    ASSERT_NE(got[0].Get(), nullptr);
    EXPECT_TRUE(std::all_of(got.begin(), got.end(), [&](const TreeRef &t) { return t.Get() == got[0].Get(); }));
    EXPECT_EQ(got[0]->GetRefCount(), kThreads + 1);
    EXPECT_EQ(LeavesOf(got[0]).size(), 12u);
  }
}
