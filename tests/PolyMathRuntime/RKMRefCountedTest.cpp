#include "RKMMutex.h"
#include "RKMPolyAtomicOperations.h"
#include "RKMPolyScopedMutex.h"
#include "RKMPolySpinLockMutex.h"
#include "RKMRef.h"
#include "RKMRefCounted.h"

#include "RuntimeTestSupport.h"

#include <gtest/gtest.h>

#include <atomic>
#include <climits>
#include <utility>
#include <vector>

namespace
{
// The destructor is the only way to see that Release deleted the object.
class Counted : public RKMRefCounted
{
public:
  explicit Counted(std::atomic<int> *deaths) : m_deaths(deaths) {}
  Counted(const Counted &) = default;
  Counted &operator=(const Counted &) = default;

private:
  ~Counted() override { m_deaths->fetch_add(1); }
  std::atomic<int> *m_deaths;
};

TEST(RKMRefCounted, CountsCopiesAndAssignment)
{
  std::atomic<int> deaths{0};
  Counted *a = new Counted(&deaths);
  EXPECT_EQ(a->GetRefCount(), 1);
  EXPECT_EQ(a->AddRef(), 2);
  EXPECT_EQ(a->AddRef(), 3);
  Counted *copy = new Counted(*a);
  Counted *target = new Counted(&deaths);
  target->AddRef();
  *target = *a;
  EXPECT_EQ(copy->GetRefCount(), 1);
  EXPECT_EQ(target->GetRefCount(), 2);
  EXPECT_EQ(a->GetRefCount(), 3);

  // Had the copy or assignment carried a's count over, one of these would delete too early or never.
  EXPECT_EQ(copy->Release(), 0);
  EXPECT_EQ(target->Release(), 1);
  EXPECT_EQ(target->Release(), 0);
  EXPECT_EQ(deaths.load(), 2);
  EXPECT_EQ(a->Release(), 2);
  EXPECT_EQ(a->Release(), 1);
  EXPECT_EQ(deaths.load(), 2);
  EXPECT_EQ(a->Release(), 0);
  EXPECT_EQ(deaths.load(), 3);
}

// Each holder owns exactly one reference: Adopt takes the caller's, Share and copies add one, moves
// pass it on, and the object dies once, with the last reference.
TEST(RKMRef, HoldsOneReferenceEach)
{
  std::atomic<int> deaths{0};
  {
    const RKMRef<Counted> a = RKMRef<Counted>::Adopt(new Counted(&deaths));
    EXPECT_EQ(a->GetRefCount(), 1);
    RKMRef<Counted> shared = RKMRef<Counted>::Share(a.Get()), copy(a);
    EXPECT_EQ((*a).GetRefCount(), 3);
    RKMRef<Counted> other = RKMRef<Counted>::Adopt(new Counted(&deaths));
    other = copy;  // releases the other object, its only reference
    EXPECT_EQ(deaths.load(), 1);
    EXPECT_EQ(a->GetRefCount(), 4);
    RKMRef<Counted> moved(std::move(copy));
    other = std::move(shared);
    EXPECT_TRUE(!copy && !shared && moved && other);
    EXPECT_EQ(moved.Get(), a.Get());
    EXPECT_EQ(a->GetRefCount(), 3);
    const RKMRef<Counted> &alias = other;
    other = alias;
    EXPECT_EQ(other.Get(), a.Get());
    EXPECT_EQ(a->GetRefCount(), 3);
    other.Reset();
    EXPECT_EQ(a->GetRefCount(), 2);
    RKMRef<Counted> detached = moved;
    Counted *raw = detached.Detach();
    EXPECT_FALSE(detached);
    EXPECT_EQ(raw->Release(), 2);

    RKMRef<Counted> none, nullAdopted = RKMRef<Counted>::Adopt(nullptr), nullShared = RKMRef<Counted>::Share(nullptr);
    EXPECT_TRUE(!none && !nullAdopted && !nullShared && none.Get() == nullptr && none.Detach() == nullptr);
    none.Reset();
    moved.Reset();
    EXPECT_EQ(a->GetRefCount(), 1);
    EXPECT_EQ(deaths.load(), 1);
  }
  EXPECT_EQ(deaths.load(), 2);
}

// Every thread owns one reference and churns extra ones; a lost increment deletes the object while
// others still use it, a lost decrement leaks it.
TEST(RKMRefCounted, ConcurrentAddRefReleaseNeverLosesACount)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 8;
  std::atomic<int> deaths{0}, zeroes{0}, early{0};
  Counted *c = new Counted(&deaths);
  for (int i = 1; i < kThreads; ++i)
    c->AddRef();
  rkmtest::RunConcurrently(kThreads, [&](int) {
    for (int r = 0; r < rkmtest::Rounds(200000); ++r)
      early += c->AddRef() < 2 || c->Release() < 1 || deaths.load() != 0;
    zeroes += c->Release() == 0;
  });
  EXPECT_EQ(early.load(), 0);
  EXPECT_EQ(zeroes.load(), 1);
  EXPECT_EQ(deaths.load(), 1);
}

TEST(RKMPolyAtomicOperations, GiveTheDocumentedValues)
{
  int w = 5;
  EXPECT_EQ(RKMPolyAtomicOperations::Increment(&w), 6);
  EXPECT_EQ(RKMPolyAtomicOperations::Decrement(&w), 5);
  EXPECT_EQ(RKMPolyAtomicOperations::CompareAndSwap(&w, 9, 3), 5);
  EXPECT_EQ(w, 5);
  EXPECT_EQ(RKMPolyAtomicOperations::CompareAndSwap(&w, 9, 5), 5);
  EXPECT_EQ(w, 9);
  w = 0x10;
  EXPECT_EQ(RKMPolyAtomicOperations::BitWiseOr(&w, 0x3), 0x10);
  EXPECT_EQ(w, 0x13);
  w = 7;
  EXPECT_EQ(RKMPolyAtomicOperations::BitWiseTestAndReset(&w, 4), 7);
  EXPECT_EQ(w, 3);
  EXPECT_EQ(RKMPolyAtomicOperations::BitWiseTestAndReset(&w, 4), 3);
  EXPECT_EQ(w, 3);
  // The sign bit is an ordinary bit for the bitwise operations.
  w = 0;
  EXPECT_EQ(RKMPolyAtomicOperations::BitWiseOr(&w, INT_MIN), 0);
  EXPECT_EQ(RKMPolyAtomicOperations::BitWiseTestAndReset(&w, INT_MIN), INT_MIN);
  EXPECT_EQ(w, 0);
}

// Threads set, clear and set again their own bit in each of many shared words, and count with
// Increment and with a CompareAndSwap retry loop: a read-modify-write that is not atomic drops a
// neighbour's bit or an increment.
TEST(RKMPolyAtomicOperations, ConcurrentUpdatesLoseNothing)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 8;
  constexpr int kWords = rkmtest::Rounds(40000);
  std::vector<int> words(kWords, 0);
  int counter = 0, casCounter = 0;
  std::atomic<int> wrongBefore{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    const int bit = 1 << (t * 3);
    for (int &w : words)
    {
      wrongBefore += (RKMPolyAtomicOperations::BitWiseOr(&w, bit) & bit) != 0;
      RKMPolyAtomicOperations::Increment(&counter);
      int seen = RKMPolyAtomicOperations::CompareAndSwap(&casCounter, 0, 0);
      for (int before; (before = RKMPolyAtomicOperations::CompareAndSwap(&casCounter, seen + 1, seen)) != seen;)
        seen = before;
    }
    for (int &w : words)
      wrongBefore += (RKMPolyAtomicOperations::BitWiseTestAndReset(&w, bit) & bit) == 0;
    for (int &w : words)
      RKMPolyAtomicOperations::BitWiseOr(&w, bit << 2);
  });
  EXPECT_EQ(wrongBefore.load(), 0);
  EXPECT_EQ(counter, kThreads * kWords);
  EXPECT_EQ(casCounter, kThreads * kWords);
  int all = 0;
  for (int t = 0; t < kThreads; ++t)
    all |= 1 << (t * 3 + 2);
  int bad = 0;
  for (int w : words)
    bad += w != all;
  EXPECT_EQ(bad, 0);
}

// A plain read-modify-write of a plain counter is exact only under mutual exclusion; the "inside"
// count catches two holders at once even when their increments happen not to collide, and
// ThreadSanitizer sees a lock without the right barriers.
template <class Enter>
void ExpectMutualExclusion(const char *what, const Enter &enterAndRun)
{
  constexpr int kThreads = 6;
  constexpr int kRounds = rkmtest::Rounds(100000);
  long counter = 0;
  std::atomic<int> inside{0}, overlaps{0};
  rkmtest::RunConcurrently(kThreads, [&](int) {
    for (int r = 0; r < kRounds; ++r)
      enterAndRun([&] {
        overlaps += inside.fetch_add(1) != 0;
        const long v = counter;
        counter = v + 1;
        inside.fetch_sub(1);
      });
  });
  EXPECT_EQ(overlaps.load(), 0) << what;
  EXPECT_EQ(counter, long(kThreads) * kRounds) << what;
}

TEST(RKMPolySpinLockMutex, ExcludesAloneAndThroughScopedMutex)
{
  rkmtest::Watchdog watchdog;
  RKMPolySpinLockMutex spin;
  ExpectMutualExclusion("Lock/Unlock", [&](const auto &critical) {
    spin.Lock();
    critical();
    spin.Unlock();
  });
  ExpectMutualExclusion("scoped spin lock", [&](const auto &critical) {
    RKMPolyScopedMutex hold(spin);
    critical();
  });
  RKMMutex mutex;
  ExpectMutualExclusion("scoped mutex", [&](const auto &critical) {
    RKMPolyScopedMutex outer(mutex);
    // The mutex is recursive: a nested scope on the same thread must neither block nor release early.
    {
      RKMPolyScopedMutex inner(mutex);
    }
    critical();
  });
}
}
