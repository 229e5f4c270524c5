#include "BVHTestTrees.h"

#include <gtest/gtest.h>

#include <thread>

namespace
{
using namespace bvhtest;
using Log = std::vector<std::string>;

// A root with a leaf and a null child; both attributes write to the journal (and count in its deaths).
RKMBVHNode *SmallHierarchy(Journal *j, RKMBVHNode *root = new RKMBVHNode)
{
  Tagged(root, 0, j, "root")->AddChild(Tagged(new RKMBVHNode, 1, j, "leaf"));
  root->AddChild(nullptr);
  return root;
}

Log Sorted(Log v) { return std::sort(v.begin(), v.end()), v; }

TEST(RKMBVHTree, LastReleaseDeletesTheHierarchyUnlessTheRootWasUnregistered)
{
  Journal j;
  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&j));
  EXPECT_EQ(tree->GetRefCount(), 1);
  EXPECT_EQ(tree->AddRef(), 2);
  EXPECT_EQ(tree->Release(), 1);
  EXPECT_TRUE(j.entries.empty());
  EXPECT_EQ(tree->Absorb(*tree), E_NOTIMPL);
  EXPECT_NE(tree->GetRoot(), nullptr);
  EXPECT_EQ(tree->Release(), 0);
  EXPECT_EQ(Sorted(j.entries), (Log{"leaf deleted", "root deleted"}));
  EXPECT_EQ(MakeTree(nullptr)->GetRoot(), nullptr);

  j.entries.clear();
  RKMBVHNode *root = SmallHierarchy(&j);
  tree = new RKMBVHTree(root);
  tree->UnregisterRootNode();
  EXPECT_EQ(tree->GetRoot(), nullptr);
  tree->Release();
  EXPECT_TRUE(j.entries.empty());
  EXPECT_EQ(root->GetNbChildren(), 2);
  delete root;
  EXPECT_EQ(j.entries.size(), 2u);
}

TEST(RKMBVHTree, RegisteringTwiceKeepsOneEntry)
{
  Journal j;
  TreeWatcher *o = new TreeWatcher(&j, "o");
  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&j));
  tree->RegisterObserver(o), tree->RegisterObserver(o), tree->RegisterObserver(nullptr);
  EXPECT_EQ(o->GetRefCount(), 2);
  tree->FlushMemory();
  EXPECT_EQ(o->calls.load(), 1);
  tree->UnregisterObserver(o);
  EXPECT_EQ(o->GetRefCount(), 1);
  // Unregistering what is not there must not release it again.
  tree->UnregisterObserver(o), tree->UnregisterObserver(nullptr);
  EXPECT_EQ(o->GetRefCount(), 1);
  tree->Release();
  EXPECT_EQ(o->calls.load(), 1);
  EXPECT_EQ(o->Release(), 0);
}

TEST(RKMBVHTree, DestructionNotifiesInOrderThenReleasesEachObserver)
{
  Journal j;
  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&j));
  std::vector<TreeWatcher *> obs;
  for (const char *name : {"a", "b", "c"})
  {
    obs.push_back(new TreeWatcher(&j, name));
    tree->RegisterObserver(obs.back());
    EXPECT_EQ(obs.back()->GetRefCount(), 2);
  }
  tree->Release();
  // Observers are told while the hierarchy still exists.
  ASSERT_EQ(j.entries.size(), 5u);
  std::sort(j.entries.begin() + 3, j.entries.end());
  EXPECT_EQ(j.entries, (Log{"a deletion", "b deletion", "c deletion", "leaf deleted", "root deleted"}));
  // Each observer is unlinked and released once: none keeps a reference on, or a link to, another.
  for (TreeWatcher *o : obs)
    EXPECT_TRUE(o->GetRefCount() == 1 && !o->Next() && !o->Prev());
  for (TreeWatcher *o : obs)
    EXPECT_EQ(o->Release(), 0);
  EXPECT_EQ(j.deaths.load(), 2 + 3);
}

TEST(RKMBVHTree, FlushNotifiesOnlyWithARootThenFlushesAndCollapsesTheHierarchy)
{
  Journal j;
  TreeWatcher *o = new TreeWatcher(&j, "o");
  RKMBVHTree *bare = new RKMBVHTree(nullptr);
  bare->RegisterObserver(o);
  bare->FlushMemory();
  EXPECT_TRUE(j.entries.empty());
  bare->UnregisterObserver(o);
  bare->Release();

  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&j, new SpyNode(&j, "root")));
  tree->RegisterObserver(o);
  tree->FlushMemory();
  EXPECT_EQ(j.entries, (Log{"o flush", "leaf flushed", "root flushed", "collapse root 0"}));
  tree->UnregisterObserver(o);
  tree->Release();
  o->Release();
}

// Each observer registered when a notification starts is called exactly once, and is alive during its
// call, whatever the others unregister meanwhile. The tree holds the observers' only references, so an
// unregistration really drops the last one.
TEST(RKMBVHTree, ObserversMayUnregisterThemselvesOrOthersDuringNotification)
{
  const std::pair<int, std::vector<int>> cases[] = {{0, {0}},    {1, {1}},    {2, {2}},
                                                    {0, {1, 2}}, {2, {0, 1}}, {1, {2, 1, 0}}};
  for (bool deletion : {true, false})
    for (const auto &c : cases)
    {
      SCOPED_TRACE(::testing::Message() << (deletion ? "deletion" : "flush") << " actor " << c.first);
      Journal j;
      RKMBVHTree *tree = new RKMBVHTree(new RKMBVHNode);
      std::vector<TreeWatcher *> obs;
      for (int i = 0; i < 3; ++i)
      {
        obs.push_back(new TreeWatcher(&j, std::to_string(i)));
        tree->RegisterObserver(obs.back());
        obs.back()->Release();
      }
      (deletion ? obs[c.first]->onDeletion : obs[c.first]->onFlush) = [tree, &c, &obs](TreeWatcher &)
      {
        for (int v : c.second)
          tree->UnregisterObserver(obs[v]);
      };
      const std::string what = deletion ? " deletion" : " flush";
      const Log all = {"0" + what, "1" + what, "2" + what};
      if (deletion)
        tree->Release();
      else
        tree->FlushMemory();
      EXPECT_EQ(j.entries, all);
      if (!deletion)
      {
        EXPECT_EQ(j.deaths.load(), static_cast<int>(c.second.size()));
        // The survivors are still registered and still in order.
        Log survivors;
        for (int i = 0; i < 3; ++i)
          if (std::find(c.second.begin(), c.second.end(), i) == c.second.end())
            survivors.push_back(all[i]);
        j.entries.clear();
        tree->FlushMemory();
        EXPECT_EQ(j.entries, survivors);
        tree->Release();
      }
      EXPECT_EQ(j.deaths.load(), 3);
    }
}

TEST(RKMBVHTree, ConcurrentRegistrationAndFlush)
{
  constexpr int kWorkers = 3, kRounds = 300;
  Journal j;
  RKMBVHNode *root = new RKMBVHNode;
  root->AddChild(new RKMBVHNode);
  RKMBVHTree *tree = new RKMBVHTree(root);
  std::vector<TreeWatcher *> obs;
  for (int i = 0; i < 2 * kWorkers; ++i)
    obs.push_back(new TreeWatcher(&j, "o" + std::to_string(i)));
  std::atomic<bool> done{false};
  std::atomic<int> ready{0};
  const auto start = [&ready]
  {
    ready.fetch_add(1);
    while (ready.load() <= kWorkers)
      std::this_thread::yield();
  };
  std::thread flusher(
      [&]
      {
        start();
        while (!done.load())
          tree->FlushMemory();
      });
  std::vector<std::thread> workers;
  for (int w = 0; w < kWorkers; ++w)
    workers.emplace_back(
        [&, w]
        {
          start();
          TreeWatcher *mine[2] = {obs[2 * w], obs[2 * w + 1]};
          for (int r = 0; r < kRounds; ++r)
          {
            tree->RegisterObserver(mine[r & 1]), tree->RegisterObserver(mine[(r + 1) & 1]);
            tree->UnregisterObserver(mine[r & 1]), tree->UnregisterObserver(mine[(r + 1) & 1]);
          }
        });
  for (std::thread &t : workers)
    t.join();
  done.store(true);
  flusher.join();
  for (TreeWatcher *o : obs)
    EXPECT_EQ(o->GetRefCount(), 1);
  tree->Release();
  for (TreeWatcher *o : obs)
    EXPECT_EQ(o->Release(), 0);
  EXPECT_EQ(j.deaths.load(), 2 * kWorkers);
}
} // namespace
