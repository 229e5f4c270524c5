#include "RKMPolySetOfMutex.h"

#include "RuntimeTestSupport.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <functional>
#include <random>
#include <thread>
#include <vector>

#if defined(__SANITIZE_THREAD__)
// The set lends its mutexes to different addresses over time, so threads that take addresses in one
// global order still take the mutex objects in varying orders. ThreadSanitizer's lock-order graph is
// built over mutex objects and reports cycles that cannot deadlock; data races are still reported.
extern "C" const char *__tsan_default_suppressions() { return "deadlock:RKMPolySetOfMutex::Lock\n"; }
#endif

using testing::internal::CaptureStdout;
using testing::internal::GetCapturedStdout;

namespace
{
// The set has 16 inline mutexes: holding this many addresses leaves only the overflow table.
constexpr int kInlineSlots = 16;

void LockAll(RKMPolySetOfMutex &set, std::vector<char> &cells)
{
  for (char &c : cells)
    ASSERT_EQ(set.Lock(&c), S_OK);
}

// Cells are addressed in place: the addresses are the identity the set knows them by.
void UnlockAll(RKMPolySetOfMutex &set, std::vector<char> &cells, const std::vector<size_t> &skip = {})
{
  for (size_t i = 0; i < cells.size(); ++i)
  {
    if (std::find(skip.begin(), skip.end(), i) == skip.end())
    {
      ASSERT_EQ(set.Unlock(&cells[i]), S_OK) << "cell " << i;
    }
  }
}

// Another thread asks for address while this one holds it: it must still wait after a while, and get
// through once release() has given the address up.
void ExpectOthersWaitUntil(RKMPolySetOfMutex &set, const void *address, const std::function<void()> &release)
{
  std::atomic<bool> got{false};
  std::thread other([&] {
    set.Lock(address);
    got = true;
    set.Unlock(address);
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_FALSE(got.load()) << "a second thread entered an address that is held";
  release();
  other.join();
  EXPECT_TRUE(got.load());
}

TEST(RKMPolySetOfMutex, NullIsRefusedQuietly)
{
  RKMPolySetOfMutex set;
  CaptureStdout();
  EXPECT_EQ(set.Lock(nullptr), S_FALSE);
  EXPECT_EQ(set.Unlock(nullptr), S_FALSE);
  EXPECT_EQ(set.Unlock(nullptr), S_FALSE);
  EXPECT_EQ(GetCapturedStdout(), "");
}

// Checked both for an inline slot and for an address in the overflow table, before and after a
// balanced lock and unlock, with other addresses held: none of that may disturb what is held.
TEST(RKMPolySetOfMutex, UnlockingWhatIsNotLockedReportsAndChangesNothing)
{
  rkmtest::Watchdog watchdog;
  RKMPolySetOfMutex set;
  std::vector<char> held(kInlineSlots + 4);
  char stranger = 0;

  CaptureStdout();
  const HRESULT never = set.Unlock(&stranger);
  EXPECT_EQ(GetCapturedStdout(), "GroBe Katastrof!\n");
  EXPECT_EQ(never, E_FAIL);
  EXPECT_TRUE(FAILED(never));

  LockAll(set, held);
  CaptureStdout();
  EXPECT_EQ(set.Unlock(&stranger), E_FAIL);
  EXPECT_EQ(GetCapturedStdout(), "GroBe Katastrof!\n");
  ExpectOthersWaitUntil(set, &held[0], [&] { EXPECT_EQ(set.Unlock(&held[0]), S_OK); });
  ExpectOthersWaitUntil(set, &held.back(), [&] { EXPECT_EQ(set.Unlock(&held.back()), S_OK); });

  CaptureStdout();
  EXPECT_EQ(set.Unlock(&held[0]), E_FAIL);
  EXPECT_EQ(set.Unlock(&held.back()), E_FAIL);
  EXPECT_EQ(GetCapturedStdout(), "GroBe Katastrof!\nGroBe Katastrof!\n");

  // The set still works, from another thread too, for the addresses that were refused.
  std::thread([&] {
    EXPECT_EQ(set.Lock(&held[0]), S_OK);
    EXPECT_EQ(set.Lock(&stranger), S_OK);
    EXPECT_EQ(set.Unlock(&stranger), S_OK);
    EXPECT_EQ(set.Unlock(&held[0]), S_OK);
  }).join();
  UnlockAll(set, held, {0, held.size() - 1});
}

// Relocking by the holder must count: the address stays held until the last matching Unlock.
TEST(RKMPolySetOfMutex, HolderMayRelockInSlotAndInOverflow)
{
  rkmtest::Watchdog watchdog;
  RKMPolySetOfMutex set;
  char inSlot = 0;
  ASSERT_EQ(set.Lock(&inSlot), S_OK);
  ASSERT_EQ(set.Lock(&inSlot), S_OK);
  ASSERT_EQ(set.Unlock(&inSlot), S_OK);
  ExpectOthersWaitUntil(set, &inSlot, [&] { EXPECT_EQ(set.Unlock(&inSlot), S_OK); });

  std::vector<char> fill(kInlineSlots);
  LockAll(set, fill);
  char inOverflow = 0;
  ASSERT_EQ(set.Lock(&inOverflow), S_OK);
  ASSERT_EQ(set.Lock(&inOverflow), S_OK);
  ASSERT_EQ(set.Unlock(&inOverflow), S_OK);
  // Freeing inline slots while the address sits in the overflow table must not let a newcomer take a
  // free slot for it and pass.
  ASSERT_EQ(set.Unlock(&fill[3]), S_OK);
  ASSERT_EQ(set.Unlock(&fill[9]), S_OK);
  ExpectOthersWaitUntil(set, &inOverflow, [&] { EXPECT_EQ(set.Unlock(&inOverflow), S_OK); });
  UnlockAll(set, fill, {3, 9});
}

struct Cell
{
  std::atomic<int> inside{0};
  long entries = 0;
};

// Eight threads lock overlapping sets of addresses (ascending, so that holding several cannot
// deadlock) while this thread pins 12 others: most locks go through the overflow table, and addresses
// move between table and inline slots while other threads wait on them. Two threads inside one cell,
// or a lost entry in the unguarded count, means the set let two holders in.
TEST(RKMPolySetOfMutex, ConcurrentOverlappingLocksExclude)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 8;
  constexpr int kCells = 24;
  constexpr int kRounds = 1500;
  RKMPolySetOfMutex set;
  std::vector<char> pinned(12);
  LockAll(set, pinned);
  std::vector<Cell> cells(kCells);
  std::vector<std::vector<long>> counted(kThreads, std::vector<long>(kCells, 0));
  std::atomic<int> overlaps{0};
  std::atomic<int> failures{0};

  rkmtest::RunConcurrently(kThreads, [&](int t) {
    std::mt19937 rng(static_cast<unsigned>(t) + 1);
    std::vector<int> pick;
    for (int r = 0; r < kRounds; ++r)
    {
      const size_t want = 2 + rng() % 4;
      pick.clear();
      while (pick.size() < want)
      {
        const int i = static_cast<int>(rng() % kCells);
        if (std::find(pick.begin(), pick.end(), i) == pick.end())
          pick.push_back(i);
      }
      std::sort(pick.begin(), pick.end());
      for (int i : pick)
      {
        Cell &c = cells[static_cast<size_t>(i)];
        failures += set.Lock(&c) != S_OK;
        overlaps += c.inside.fetch_add(1) != 0;
        ++c.entries;
        ++counted[static_cast<size_t>(t)][static_cast<size_t>(i)];
        if (rng() % 8 == 0)
        {
          failures += set.Lock(&c) != S_OK;
          ++c.entries;
          ++counted[static_cast<size_t>(t)][static_cast<size_t>(i)];
          failures += set.Unlock(&c) != S_OK;
        }
      }
      std::this_thread::yield();
      for (auto it = pick.rbegin(); it != pick.rend(); ++it)
      {
        Cell &c = cells[static_cast<size_t>(*it)];
        c.inside.fetch_sub(1);
        failures += set.Unlock(&c) != S_OK;
      }
    }
  });
  UnlockAll(set, pinned);

  EXPECT_EQ(overlaps.load(), 0);
  EXPECT_EQ(failures.load(), 0);
  for (int i = 0; i < kCells; ++i)
  {
    long expected = 0;
    for (const std::vector<long> &perThread : counted)
      expected += perThread[static_cast<size_t>(i)];
    EXPECT_EQ(cells[static_cast<size_t>(i)].entries, expected) << "cell " << i;
  }
  // Every count went back to zero: each cell is free, and unlocked once too often it is refused.
  CaptureStdout();
  int refused = 0;
  for (Cell &c : cells)
  {
    EXPECT_EQ(set.Lock(&c), S_OK);
    EXPECT_EQ(set.Unlock(&c), S_OK);
    refused += set.Unlock(&c) == E_FAIL;
  }
  GetCapturedStdout();
  EXPECT_EQ(refused, kCells);
}

// Four overflow addresses at a time rotate through 64: every unlock gives a mutex back and the next
// lock takes it for another address. Nothing can be measured from outside; a leak shows under
// AddressSanitizer, a table that grows with removals shows as a slow test.
TEST(RKMPolySetOfMutex, OverflowChurnKeepsWorking)
{
  rkmtest::Watchdog watchdog;
  constexpr int kChurn = 64;
  constexpr int kWindow = 4;
  constexpr int kCycles = 100000;
  RKMPolySetOfMutex set;
  std::vector<char> fill(kInlineSlots);
  LockAll(set, fill);
  std::vector<char> churn(kChurn);
  for (int i = 0; i < kWindow; ++i)
    ASSERT_EQ(set.Lock(&churn[static_cast<size_t>(i)]), S_OK);
  int failures = 0;
  for (int i = 0; i < kCycles; ++i)
  {
    failures += set.Unlock(&churn[static_cast<size_t>(i % kChurn)]) != S_OK;
    failures += set.Lock(&churn[static_cast<size_t>((i + kWindow) % kChurn)]) != S_OK;
  }
  EXPECT_EQ(failures, 0);

  const int first = kCycles % kChurn;
  for (int i = 0; i < kWindow; ++i)
  {
    const char *held = &churn[static_cast<size_t>((first + i) % kChurn)];
    ExpectOthersWaitUntil(set, held, [&] { EXPECT_EQ(set.Unlock(held), S_OK); });
  }
  CaptureStdout();
  EXPECT_EQ(set.Unlock(&churn[static_cast<size_t>(first)]), E_FAIL);
  EXPECT_EQ(GetCapturedStdout(), "GroBe Katastrof!\n");
  UnlockAll(set, fill);
}
}
