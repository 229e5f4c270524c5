#include "RKMMutex.h"
#include "RKMPolyAtomicOperations.h"
#include "RKMPolyScopedMutex.h"
#include "RKMPolySpinLockMutex.h"
#include "RKMRef.h"
#include "RKMRefCounted.h"

#include "RuntimeTestSupport.h"

#include <algorithm>
#include <climits>
#include <utility>

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

// Had the copy or assignment carried a's count over, a release would delete too early or never.
TEST(RKMRefCounted, CountsCopiesAndAssignment)
{
  std::atomic<int> deaths{0};
  Counted *a = new Counted(&deaths), *target = new Counted(&deaths);
  EXPECT_TRUE(a->GetRefCount() == 1 && a->AddRef() == 2 && target->AddRef() == 2);
  Counted *copy = new Counted(*a);
  *target = *a;
  EXPECT_TRUE(copy->GetRefCount() == 1 && target->GetRefCount() == 2 && a->GetRefCount() == 2);
  EXPECT_TRUE(copy->Release() == 0 && target->Release() == 1 && target->Release() == 0 && deaths.load() == 2);
  EXPECT_TRUE(a->Release() == 1 && deaths.load() == 2 && a->Release() == 0 && deaths.load() == 3);
}

// Each holder owns exactly one reference: Adopt takes the caller's, Share and copies add one, moves pass it
// on, and the object dies once, with the last reference.
TEST(RKMRef, HoldsOneReferenceEach)
{
  std::atomic<int> deaths{0};
  {
    const RKMRef<Counted> a = RKMRef<Counted>::Adopt(new Counted(&deaths));
    EXPECT_EQ(a->GetRefCount(), 1);
    RKMRef<Counted> shared = RKMRef<Counted>::Share(a.Get()), copy(a), other = RKMRef<Counted>::Adopt(new Counted(&deaths));
    EXPECT_EQ((*a).GetRefCount(), 3);
    other = copy; // releases the other object, its only reference
    EXPECT_TRUE(deaths.load() == 1 && a->GetRefCount() == 4);
    RKMRef<Counted> moved(std::move(copy));
    other = std::move(shared);
    EXPECT_TRUE(!copy && !shared && moved && other && moved.Get() == a.Get() && a->GetRefCount() == 3);
    const RKMRef<Counted> &alias = other;
    other = alias;
    EXPECT_TRUE(other.Get() == a.Get() && a->GetRefCount() == 3);
    other.Reset();
    EXPECT_EQ(a->GetRefCount(), 2);
    RKMRef<Counted> detached = moved;
    Counted *raw = detached.Detach();
    EXPECT_TRUE(!detached && raw->Release() == 2);
    RKMRef<Counted> none, nullAdopted = RKMRef<Counted>::Adopt(nullptr), nullShared = RKMRef<Counted>::Share(nullptr);
    EXPECT_TRUE(!none && !nullAdopted && !nullShared && none.Get() == nullptr && none.Detach() == nullptr);
    none.Reset();
    moved.Reset();
    EXPECT_TRUE(a->GetRefCount() == 1 && deaths.load() == 1);
  }
  EXPECT_EQ(deaths.load(), 2);
}

// Every thread owns one reference and churns extra ones; a lost increment deletes the object while others
// still use it, a lost decrement leaks it.
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
  EXPECT_TRUE(early.load() == 0 && zeroes.load() == 1 && deaths.load() == 1);
}

// Increment and Decrement give the new word, the others the old one; a failed CompareAndSwap changes
// nothing, nor does resetting a clear bit; the sign bit is an ordinary bit. The rest is checked below.
TEST(RKMPolyAtomicOperations, GiveTheDocumentedValues)
{
  using Ops = RKMPolyAtomicOperations;
  int w = 5;
  EXPECT_TRUE(Ops::Increment(&w) == 6 && Ops::Decrement(&w) == 5);
  EXPECT_TRUE(Ops::CompareAndSwap(&w, 9, 3) == 5 && w == 5 && Ops::CompareAndSwap(&w, 9, 5) == 5 && w == 9);
  w = 3;
  EXPECT_TRUE(Ops::BitWiseTestAndReset(&w, 4) == 3 && w == 3);
  w = 0;
  EXPECT_TRUE(Ops::BitWiseOr(&w, INT_MIN) == 0 && Ops::BitWiseTestAndReset(&w, INT_MIN) == INT_MIN && w == 0);
}

// Threads set, clear and set again their own bit in each of many shared words, and count with Increment and
// with a CompareAndSwap retry loop: a read-modify-write that is not atomic drops a neighbour's bit or a count.
TEST(RKMPolyAtomicOperations, ConcurrentUpdatesLoseNothing)
{
  using Ops = RKMPolyAtomicOperations;
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 8, kWords = rkmtest::Rounds(40000);
  std::vector<int> words(kWords, 0);
  int counter = 0, casCounter = 0, all = 0;
  std::atomic<int> wrongBefore{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    const int bit = 1 << (t * 3);
    for (int &w : words)
    {
      wrongBefore += (Ops::BitWiseOr(&w, bit) & bit) != 0;
      Ops::Increment(&counter);
      for (int seen = Ops::CompareAndSwap(&casCounter, 0, 0), before; (before = Ops::CompareAndSwap(&casCounter, seen + 1, seen)) != seen;)
        seen = before;
    }
    for (int &w : words)
      wrongBefore += (Ops::BitWiseTestAndReset(&w, bit) & bit) == 0;
    for (int &w : words)
      Ops::BitWiseOr(&w, bit << 2);
  });
  EXPECT_TRUE(wrongBefore.load() == 0 && counter == kThreads * kWords && casCounter == kThreads * kWords);
  for (int t = 0; t < kThreads; ++t)
    all |= 1 << (t * 3 + 2);
  EXPECT_EQ(std::count(words.begin(), words.end(), all), kWords);
}

// A plain read-modify-write of a plain counter is exact only under mutual exclusion; the "inside" count
// catches two holders at once even when their increments happen not to collide, and ThreadSanitizer sees a
// lock without the right barriers.
template <class Enter>
void ExpectMutualExclusion(const char *what, const Enter &enterAndRun)
{
  constexpr int kThreads = 6, kRounds = rkmtest::Rounds(100000);
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
  EXPECT_TRUE(overlaps.load() == 0 && counter == long(kThreads) * kRounds) << what;
}

// The mutex is recursive: a nested scope on the same thread must neither block nor release early.
TEST(RKMPolySpinLockMutex, ExcludesAloneAndThroughScopedMutex)
{
  rkmtest::Watchdog watchdog;
  RKMPolySpinLockMutex spin;
  RKMMutex mutex;
  ExpectMutualExclusion("Lock/Unlock", [&](const auto &critical) {
    spin.Lock();
    critical();
    spin.Unlock();
  });
  ExpectMutualExclusion("scoped spin lock", [&](const auto &critical) {
    RKMPolyScopedMutex hold(spin);
    critical();
  });
  ExpectMutualExclusion("scoped mutex", [&](const auto &critical) {
    RKMPolyScopedMutex outer(mutex);
    RKMPolyScopedMutex{mutex}; // a nested scope
    critical();
  });
}
}
