#include "RKMBVHAttribute.h"
#include "RKMBVHNode.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeObserver.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <functional>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

namespace
{
// Shared by the observers of one test; the mutex only matters for the threaded case.
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

class RecObserver : public RKMBVHTreeObserver
{
public:
  RecObserver(Journal *journal, std::string name) : m_journal(journal), m_name(std::move(name)) {}

  void OnTreeDeletion() override { Call("deletion", onDeletion); }
  void OnTreeFlush() override { Call("flush", onFlush); }

  std::function<void(RecObserver &)> onDeletion, onFlush;
  std::atomic<int> calls{0};

private:
  ~RecObserver() override
  {
    m_magic = 0;
    ++m_journal->deaths;
  }
  void Call(const char *what, const std::function<void(RecObserver &)> &hook)
  {
    // A freed observer fails here at the latest (and under AddressSanitizer at once).
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

class FlushAttr : public RKMBVHAttribute
{
public:
  FlushAttr(Journal *journal, std::string name) : m_journal(journal), m_name(std::move(name)) {}
  ~FlushAttr() override { m_journal->Add(m_name + " deleted"); }
  void FlushComputedData() override { m_journal->Add(m_name + " flushed"); }

private:
  Journal *m_journal;
  std::string m_name;
};

class CollapseSpy : public RKMBVHNode
{
public:
  explicit CollapseSpy(Journal *journal) : m_journal(journal) {}
  void ForceCollapse(int level) override
  {
    m_journal->Add("collapse " + std::to_string(level));
    RKMBVHNode::ForceCollapse(level);
  }

private:
  Journal *m_journal;
};

RKMBVHNode *SmallHierarchy(Journal *journal)
{
  RKMBVHNode *root = new RKMBVHNode;
  root->SetAttribute(new FlushAttr(journal, "root"));
  RKMBVHNode *leaf = new RKMBVHNode;
  leaf->SetAttribute(new FlushAttr(journal, "leaf"));
  root->AddChild(leaf);
  root->AddChild(nullptr);
  return root;
}

TEST(RKMBVHTree, LastReleaseDeletesTheHierarchy)
{
  Journal journal;
  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&journal));
  EXPECT_EQ(tree->GetRefCount(), 1);
  EXPECT_EQ(tree->AddRef(), 2);
  EXPECT_EQ(tree->Release(), 1);
  EXPECT_TRUE(journal.entries.empty());
  EXPECT_EQ(tree->Absorb(*tree), E_NOTIMPL);
  EXPECT_EQ(tree->SizeOf(), 0u);
  EXPECT_NE(tree->GetRoot(), nullptr);
  EXPECT_EQ(tree->Release(), 0);
  std::sort(journal.entries.begin(), journal.entries.end());
  EXPECT_EQ(journal.entries, (std::vector<std::string>{"leaf deleted", "root deleted"}));

  RKMBVHTree *empty = new RKMBVHTree(nullptr);
  EXPECT_EQ(empty->GetRoot(), nullptr);
  EXPECT_EQ(empty->Release(), 0);
}

TEST(RKMBVHTree, UnregisteredRootOutlivesTheTree)
{
  Journal journal;
  RKMBVHNode *root = SmallHierarchy(&journal);
  RKMBVHTree *tree = new RKMBVHTree(root);
  tree->UnregisterRootNode();
  EXPECT_EQ(tree->GetRoot(), nullptr);
  tree->Release();
  EXPECT_TRUE(journal.entries.empty());
  EXPECT_EQ(root->GetNbChildren(), 2);
  delete root;
  EXPECT_EQ(journal.entries.size(), 2u);
}

TEST(RKMBVHTree, RegisteringTwiceKeepsOneEntry)
{
  Journal journal;
  RecObserver *o = new RecObserver(&journal, "o");
  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&journal));
  tree->RegisterObserver(o);
  tree->RegisterObserver(o);
  tree->RegisterObserver(nullptr);
  EXPECT_EQ(o->GetRefCount(), 2);
  tree->FlushMemory();
  EXPECT_EQ(o->calls.load(), 1);
  tree->UnregisterObserver(o);
  EXPECT_EQ(o->GetRefCount(), 1);
  // Unregistering what is not there must not release it again.
  tree->UnregisterObserver(o);
  tree->UnregisterObserver(nullptr);
  EXPECT_EQ(o->GetRefCount(), 1);
  tree->Release();
  EXPECT_EQ(o->calls.load(), 1);
  EXPECT_EQ(o->Release(), 0);
}

TEST(RKMBVHTree, DestructionNotifiesInOrderThenReleasesEachObserver)
{
  Journal journal;
  RKMBVHTree *tree = new RKMBVHTree(SmallHierarchy(&journal));
  std::vector<RecObserver *> obs;
  for (const char *name : {"a", "b", "c"})
  {
    obs.push_back(new RecObserver(&journal, name));
    tree->RegisterObserver(obs.back());
    EXPECT_EQ(obs.back()->GetRefCount(), 2);
  }
  tree->Release();
  // Observers are told while the hierarchy still exists.
  ASSERT_EQ(journal.entries.size(), 5u);
  std::sort(journal.entries.begin() + 3, journal.entries.end());
  EXPECT_EQ(journal.entries, (std::vector<std::string>{"a deletion", "b deletion", "c deletion", "leaf deleted",
                                                       "root deleted"}));
  // Each observer is unlinked and released once: none keeps a reference on, or a link to, another.
  for (RecObserver *o : obs)
  {
    EXPECT_EQ(o->GetRefCount(), 1);
    EXPECT_EQ(o->Next(), nullptr);
    EXPECT_EQ(o->Prev(), nullptr);
  }
  for (RecObserver *o : obs)
    EXPECT_EQ(o->Release(), 0);
  EXPECT_EQ(journal.deaths.load(), 3);
}

TEST(RKMBVHTree, FlushNotifiesOnlyWithARootThenFlushesTheHierarchy)
{
  Journal journal;
  RecObserver *o = new RecObserver(&journal, "o");
  RKMBVHTree *bare = new RKMBVHTree(nullptr);
  bare->RegisterObserver(o);
  bare->FlushMemory();
  EXPECT_TRUE(journal.entries.empty());
  bare->UnregisterObserver(o);
  bare->Release();

  CollapseSpy *root = new CollapseSpy(&journal);
  root->SetAttribute(new FlushAttr(&journal, "root"));
  RKMBVHNode *leaf = new RKMBVHNode;
  leaf->SetAttribute(new FlushAttr(&journal, "leaf"));
  root->AddChild(nullptr);
  root->AddChild(leaf);
  RKMBVHTree *tree = new RKMBVHTree(root);
  tree->RegisterObserver(o);
  tree->FlushMemory();
  EXPECT_EQ(journal.entries, (std::vector<std::string>{"o flush", "leaf flushed", "root flushed", "collapse 0"}));
  tree->UnregisterObserver(o);
  tree->Release();
  o->Release();
}

// Each observer that is registered when a notification starts is called exactly once, and is alive
// during its call, whatever the others unregister meanwhile. The tree is the only owner of the
// observers here, so an unregistration really drops the last reference of the chain.
void CheckUnregisteringDuringNotification(bool deletion, int actor, std::vector<int> victims)
{
  SCOPED_TRACE(::testing::Message() << (deletion ? "deletion" : "flush") << " actor " << actor);
  Journal journal;
  RKMBVHTree *tree = new RKMBVHTree(new RKMBVHNode);
  std::vector<RecObserver *> obs;
  for (int i = 0; i < 3; ++i)
  {
    obs.push_back(new RecObserver(&journal, std::to_string(i)));
    tree->RegisterObserver(obs.back());
    obs.back()->Release();
  }
  auto hook = [tree, victims, &obs](RecObserver &) {
    for (int v : victims)
      tree->UnregisterObserver(obs[v]);
  };
  (deletion ? obs[actor]->onDeletion : obs[actor]->onFlush) = hook;
  const std::string what = deletion ? " deletion" : " flush";
  if (!deletion)
  {
    tree->FlushMemory();
    EXPECT_EQ(journal.entries, (std::vector<std::string>{"0" + what, "1" + what, "2" + what}));
    EXPECT_EQ(journal.deaths.load(), static_cast<int>(victims.size()));
    // The survivors are still registered and still in order.
    journal.entries.clear();
    tree->FlushMemory();
    std::vector<std::string> expected;
    for (int i = 0; i < 3; ++i)
      if (std::find(victims.begin(), victims.end(), i) == victims.end())
        expected.push_back(std::to_string(i) + what);
    EXPECT_EQ(journal.entries, expected);
    tree->Release();
  }
  else
  {
    tree->Release();
    EXPECT_EQ(journal.entries, (std::vector<std::string>{"0" + what, "1" + what, "2" + what}));
  }
  EXPECT_EQ(journal.deaths.load(), 3);
}

TEST(RKMBVHTree, ObserversMayUnregisterThemselvesOrOthersDuringNotification)
{
  for (bool deletion : {true, false})
  {
    CheckUnregisteringDuringNotification(deletion, 0, {0});
    CheckUnregisteringDuringNotification(deletion, 1, {1});
    CheckUnregisteringDuringNotification(deletion, 2, {2});
    CheckUnregisteringDuringNotification(deletion, 0, {1, 2});
    CheckUnregisteringDuringNotification(deletion, 2, {0, 1});
    CheckUnregisteringDuringNotification(deletion, 1, {2, 1, 0});
  }
}

TEST(RKMBVHTree, ConcurrentRegistrationAndFlush)
{
  constexpr int kWorkers = 3;
  constexpr int kRounds = 300;
  Journal journal;
  RKMBVHNode *root = new RKMBVHNode;
  root->AddChild(new RKMBVHNode);
  RKMBVHTree *tree = new RKMBVHTree(root);
  std::vector<RecObserver *> obs;
  for (int i = 0; i < 2 * kWorkers; ++i)
    obs.push_back(new RecObserver(&journal, "o" + std::to_string(i)));
  std::atomic<bool> done{false};
  std::atomic<int> ready{0};
  std::thread flusher([&] {
    ready.fetch_add(1);
    while (ready.load() <= kWorkers)
      std::this_thread::yield();
    while (!done.load())
      tree->FlushMemory();
  });
  std::vector<std::thread> workers;
  for (int w = 0; w < kWorkers; ++w)
    workers.emplace_back([&, w] {
      ready.fetch_add(1);
      while (ready.load() <= kWorkers)
        std::this_thread::yield();
      RecObserver *mine[2] = {obs[2 * w], obs[2 * w + 1]};
      for (int r = 0; r < kRounds; ++r)
      {
        tree->RegisterObserver(mine[r & 1]);
        tree->RegisterObserver(mine[(r + 1) & 1]);
        tree->UnregisterObserver(mine[r & 1]);
        tree->UnregisterObserver(mine[(r + 1) & 1]);
      }
    });
  for (std::thread &t : workers)
    t.join();
  done.store(true);
  flusher.join();
  for (RecObserver *o : obs)
    EXPECT_EQ(o->GetRefCount(), 1);
  tree->Release();
  for (RecObserver *o : obs)
    EXPECT_EQ(o->Release(), 0);
  EXPECT_EQ(journal.deaths.load(), 2 * kWorkers);
}
}
