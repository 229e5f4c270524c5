#include "RKMPolySetOfMutex.h"

#include "RuntimeTestSupport.h"

#include <algorithm>
#include <numeric>
#include <random>

#if defined(__SANITIZE_THREAD__)
// The set lends its mutexes to different addresses over time, so threads that take addresses in one global
// order still take the mutex objects in varying orders. ThreadSanitizer's lock-order graph is built over
// mutex objects and reports cycles that cannot deadlock; data races are still reported.
extern "C" const char *__tsan_default_suppressions() { return "deadlock:RKMPolySetOfMutex::Lock\n"; }
#endif

using testing::internal::CaptureStdout;
using testing::internal::GetCapturedStdout;

namespace
{
// The set has 16 inline mutexes: holding this many addresses leaves only the overflow table. Cells are
// addressed in place: their addresses are the identity the set knows them by.
constexpr int kInlineSlots = 16;

void LockAll(RKMPolySetOfMutex &set, std::vector<char> &cells, HRESULT (RKMPolySetOfMutex::*op)(const void *) = &RKMPolySetOfMutex::Lock,
             const std::vector<size_t> &skip = {})
{
  for (size_t i = 0; i < cells.size(); ++i)
    EXPECT_TRUE(std::count(skip.begin(), skip.end(), i) || (set.*op)(&cells[i]) == S_OK) << "cell " << i;
}
void UnlockAll(RKMPolySetOfMutex &set, std::vector<char> &cells, const std::vector<size_t> &skip = {})
{
  LockAll(set, cells, &RKMPolySetOfMutex::Unlock, skip);
}

// Another thread asks for address while this one holds it: it must still wait after a while, and get
// through once the holder has unlocked it, the last time.
void ExpectOthersWaitForTheLastUnlock(RKMPolySetOfMutex &set, const void *address)
{
  std::atomic<bool> got{false};
  std::thread other([&] {
    set.Lock(address);
    got = true;
    set.Unlock(address);
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_FALSE(got.load()) << "a second thread entered an address that is held";
  EXPECT_EQ(set.Unlock(address), S_OK);
  other.join();
  EXPECT_TRUE(got.load());
}

// Unlocking what is not locked is reported and refused.
void ExpectRefused(RKMPolySetOfMutex &set, const void *address)
{
  CaptureStdout();
  EXPECT_EQ(set.Unlock(address), E_FAIL);
  EXPECT_EQ(GetCapturedStdout(), "GroBe Katastrof!\n");
}

// Null is refused quietly, unlocking what is not locked loudly, changing nothing. Relocking by the holder
// counts: the address stays held until the last matching Unlock, both in an inline slot and in the overflow
// table; freeing inline slots while an address sits in the table must not let a newcomer take a slot for it.
TEST(RKMPolySetOfMutex, RelockCountsAndUnlockingWhatIsNotLockedIsRefused)
{
  rkmtest::Watchdog watchdog;
  RKMPolySetOfMutex set;
  std::vector<char> held(kInlineSlots + 4);
  char stranger = 0;
  CaptureStdout();
  EXPECT_TRUE(set.Lock(nullptr) == S_FALSE && set.Unlock(nullptr) == S_FALSE && set.Unlock(nullptr) == S_FALSE);
  EXPECT_EQ(GetCapturedStdout(), "");
  ExpectRefused(set, &stranger);
  ASSERT_TRUE(set.Lock(&stranger) == S_OK && set.Lock(&stranger) == S_OK && set.Unlock(&stranger) == S_OK);
  ExpectOthersWaitForTheLastUnlock(set, &stranger);
  LockAll(set, held);
  ExpectRefused(set, &stranger);
  ASSERT_TRUE(set.Lock(&held[0]) == S_OK && set.Lock(&held.back()) == S_OK);
  ASSERT_TRUE(set.Unlock(&held[0]) == S_OK && set.Unlock(&held.back()) == S_OK);
  ASSERT_TRUE(set.Unlock(&held[3]) == S_OK && set.Unlock(&held[9]) == S_OK);
  ExpectOthersWaitForTheLastUnlock(set, &held[0]);
  ExpectOthersWaitForTheLastUnlock(set, &held.back());
  ExpectRefused(set, &held[0]);
  ExpectRefused(set, &held.back());
  // The set still works, from another thread too, for the addresses that were refused.
  std::thread([&] {
    EXPECT_TRUE(set.Lock(&held[0]) == S_OK && set.Lock(&stranger) == S_OK);
    EXPECT_TRUE(set.Unlock(&stranger) == S_OK && set.Unlock(&held[0]) == S_OK);
  }).join();
  UnlockAll(set, held, {0, 3, 9, held.size() - 1});
}

// Eight threads lock overlapping sets of addresses (ascending, so that holding several cannot deadlock),
// sometimes twice, while this thread pins 12 others: most locks go through the overflow table, and addresses
// move between table and inline slots while other threads wait on them. Two threads inside one cell, or a
// lost entry in the unguarded count, means the set let two holders in.
TEST(RKMPolySetOfMutex, ConcurrentOverlappingLocksExclude)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 8, kCells = 24, kRounds = 1500;
  struct Cell
  {
    std::atomic<int> inside{0};
    long entries = 0;
  };
  RKMPolySetOfMutex set;
  std::vector<char> pinned(12);
  LockAll(set, pinned);
  std::vector<Cell> cells(kCells);
  std::vector<long> entered(kThreads, 0); // per thread, so that counting adds no synchronisation
  std::atomic<int> overlaps{0}, failures{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    std::mt19937 rng(static_cast<unsigned>(t) + 1);
    std::vector<int> pick;
    for (int r = 0; r < kRounds; ++r)
    {
      pick.clear();
      for (const size_t want = 2 + rng() % 4; pick.size() < want;)
        if (const int i = static_cast<int>(rng() % kCells); std::find(pick.begin(), pick.end(), i) == pick.end())
          pick.push_back(i);
      std::sort(pick.begin(), pick.end());
      for (int i : pick)
      {
        Cell &c = cells[static_cast<size_t>(i)];
        failures += set.Lock(&c) != S_OK;
        overlaps += c.inside.fetch_add(1) != 0;
        const int times = rng() % 8 == 0 ? 2 : 1;
        c.entries += times, entered[static_cast<size_t>(t)] += times;
        failures += times == 2 && (set.Lock(&c) != S_OK || set.Unlock(&c) != S_OK);
      }
      std::this_thread::yield();
      for (auto it = pick.rbegin(); it != pick.rend(); ++it)
      {
        cells[static_cast<size_t>(*it)].inside.fetch_sub(1);
        failures += set.Unlock(&cells[static_cast<size_t>(*it)]) != S_OK;
      }
    }
  });
  UnlockAll(set, pinned);
  EXPECT_TRUE(overlaps.load() == 0 && failures.load() == 0);
  long counted = 0;
  for (const Cell &c : cells)
    counted += c.entries;
  EXPECT_EQ(counted, std::accumulate(entered.begin(), entered.end(), 0L));
  // Every count went back to zero: each cell is free, and unlocked once too often it is refused.
  CaptureStdout();
  int refused = 0;
  for (Cell &c : cells)
    refused += set.Lock(&c) == S_OK && set.Unlock(&c) == S_OK && set.Unlock(&c) == E_FAIL;
  GetCapturedStdout();
  EXPECT_EQ(refused, kCells);
}

// Four overflow addresses at a time rotate through 64: every unlock gives a mutex back and the next lock
// takes it for another address. A leak shows under AddressSanitizer, a table that grows with removals as a
// slow test.
TEST(RKMPolySetOfMutex, OverflowChurnKeepsWorking)
{
  rkmtest::Watchdog watchdog;
  constexpr int kChurn = 64, kWindow = 4, kCycles = 100000;
  RKMPolySetOfMutex set;
  std::vector<char> fill(kInlineSlots), churn(kChurn);
  LockAll(set, fill);
  for (int i = 0; i < kWindow; ++i)
    ASSERT_EQ(set.Lock(&churn[static_cast<size_t>(i)]), S_OK);
  int failures = 0;
  for (int i = 0; i < kCycles; ++i)
    failures += set.Unlock(&churn[static_cast<size_t>(i % kChurn)]) != S_OK ||
                set.Lock(&churn[static_cast<size_t>((i + kWindow) % kChurn)]) != S_OK;
  EXPECT_EQ(failures, 0);
  for (int i = 0; i < kWindow; ++i)
    ExpectOthersWaitForTheLastUnlock(set, &churn[static_cast<size_t>((kCycles + i) % kChurn)]);
  ExpectRefused(set, &churn[kCycles % kChurn]);
  UnlockAll(set, fill);
}
}
