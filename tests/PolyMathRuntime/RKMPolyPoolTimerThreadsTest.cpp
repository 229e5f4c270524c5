#include "RKMEvent.h"
#include "RKMPolyDebugObjectTrace.h"
#include "RKMPolyDebugStackTrace.h"
#include "RKMPolyLittleTimer.h"
#include "RKMPolyPool.h"
#include "RKMPolyThreads.h"
#include "RKMSysServices.h"

#include "RuntimeTestSupport.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <memory>

#include <pthread.h>

namespace
{
// Blocks of every size class and past them are taken on several threads and returned on others: each must
// be aligned, disjoint from the rest and keep what its owner wrote until it is freed.
TEST(RKMPolyPool, BlocksAreAlignedDisjointAndFreedFromOtherThreads)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 4;
  RKMSysPool *const pool = RKMPolyPool::GetDefaultPool();
  struct Block
  {
    unsigned char *p;
    unsigned size;
    unsigned char stamp;
  };
  std::vector<std::vector<Block>> taken(kThreads);
  std::atomic<int> otherPool{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    otherPool += RKMPolyPool::GetDefaultPool() != pool;
    for (int round = 0; round < 20; ++round)
      for (unsigned size : {1, 15, 16, 17, 48, 100, 511, 512, 513, 4096, 70000})
      {
        void *p = (round + t) % 2 ? RKMPolyPool::AllocateObjectInTSPool(size) : RKMPolyPool::AllocateObjectInDefaultPool(size);
        const unsigned char stamp = static_cast<unsigned char>(1 + (t * 31 + round) % 250);
        if (p)
          std::memset(p, stamp, size);
        taken[static_cast<size_t>(t)].push_back({static_cast<unsigned char *>(p), size, stamp});
      }
  });
  EXPECT_TRUE(pool && otherPool.load() == 0);
  std::vector<Block> all;
  for (const std::vector<Block> &v : taken)
    all.insert(all.end(), v.begin(), v.end());
  std::sort(all.begin(), all.end(), [](const Block &a, const Block &b) { return a.p < b.p; });
  ASSERT_NE(all.front().p, nullptr);
  for (size_t i = 0; i < all.size(); ++i)
  {
    const Block &b = all[i];
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(b.p) % 16, 0u) << b.size << " bytes";
    EXPECT_TRUE(i + 1 == all.size() || b.p + b.size <= all[i + 1].p) << "overlapping blocks";
    EXPECT_TRUE(std::all_of(b.p, b.p + b.size, [&](unsigned char c) { return c == b.stamp; })) << b.size << " bytes overwritten";
  }
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    for (const Block &b : taken[static_cast<size_t>((t + 1) % kThreads)])
      RKMPolyPool::FreeObjectFromPool(b.p);
  });
  RKMPolyPool::FreeObjectFromPool(nullptr);
}

// A stop with no start before it has no elapsed time to add.
TEST(RKMPolyLittleTimer, AccumulatesCallsValuesAndTime)
{
  RKMPolyLittleTimer timer(7), later;
  EXPECT_TRUE(timer.GetId() > 0 && later.GetId() > timer.GetId());
  for (int i = 0; i < 2; ++i)
  {
    timer.start(1);
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
    timer.stop(2);
  }
  EXPECT_TRUE(timer.GetTotalTime() >= 15.0 && timer.GetTotalTime() <= 200.0) << timer.GetTotalTime() << " ms";
  EXPECT_TRUE(timer.GetNbCalls() == 2 && timer.GetValue() == 6);
  timer.Reset();
  EXPECT_TRUE(timer.GetTotalTime() == 0.0 && timer.GetNbCalls() == 0 && timer.GetValue() == 0);
  std::this_thread::sleep_for(std::chrono::milliseconds(2));
  later.stop(3);
  EXPECT_TRUE(later.GetTotalTime() == 0.0 && later.GetNbCalls() == 0 && later.GetValue() == 3);
}

// The timer made for a slot is never freed: a global slot keeps it reachable for the leak checker.
void *g_racedSlot = nullptr;

TEST(RKMPolyLittleTimer, RacingOnOneSlotMakesOneTimer)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 8;
  const int idsBefore = RKMPolyLittleTimer::s_id;
  RKMPolyLittleTimer *got[kThreads] = {};
  rkmtest::RunConcurrently(kThreads, [&](int t) { got[t] = RKMGetPolyLittleTimer(g_racedSlot); });
  ASSERT_NE(got[0], nullptr);
  EXPECT_TRUE(std::all_of(got, got + kThreads, [&](RKMPolyLittleTimer *t) { return t == got[0]; }));
  EXPECT_EQ(g_racedSlot, got[0]);
  EXPECT_EQ(RKMPolyLittleTimer::s_id, idsBefore + 1);
}

struct Job
{
  std::atomic<int> calls{0};
  RKMEvent *gate = nullptr;
  std::atomic<unsigned long> self{0};
};

int CountCall(void *argument)
{
  Job *job = static_cast<Job *>(argument);
  job->self = static_cast<unsigned long>(pthread_self());
  if (job->gate)
    job->gate->Wait(10000);
  return 100 + job->calls.fetch_add(1) + 1;
}

// Without a function nothing runs; a run calls it count times (at least once) on one thread, which Join
// ends once; while it is alive a second Run is refused.
TEST(RKMPolyThreads, RunsTheFunctionCountTimesJoinsOnceAndReportsItsStatus)
{
  rkmtest::Watchdog watchdog;
  RKMPolyThreads thread;
  EXPECT_TRUE(thread.Join() == S_FALSE && thread.Run() == E_FAIL);
  EXPECT_TRUE(thread.GetStatus() == RKMThreads::NotStarted && !thread.IsRunning());
  std::unique_ptr<RKMEvent> gate(CreateRKMEvent(1));
  Job job;
  ASSERT_TRUE(job.gate = gate.get());
  thread.SetFunction(&CountCall);
  thread.SetArgument(&job);
  ASSERT_EQ(thread.Run(3), S_OK);
  EXPECT_TRUE(thread.IsRunning() && thread.GetStatus() == RKMThreads::Running);
  EXPECT_TRUE(thread.Run() == E_FAIL && thread.Kill() == E_NOTIMPL) << "a second Run while the first thread is alive";
  gate->Set();
  EXPECT_TRUE(thread.Join() == S_OK && thread.Join() == S_FALSE);
  EXPECT_TRUE(!thread.IsRunning() && thread.GetStatus() == RKMThreads::Finished);
  EXPECT_TRUE(job.calls.load() == 3 && thread.GetThreadReturnCode() == 103 && thread.GetThreadId() == job.self.load());
  ASSERT_EQ(thread.Run(0), S_OK);
  EXPECT_TRUE(thread.Join() == S_OK && thread.GetThreadReturnCode() == 104);
}

TEST(RKMEvent, AutoResetLetsOneWaiterThroughPerSet)
{
  rkmtest::Watchdog watchdog;
  std::unique_ptr<RKMEvent> event(CreateRKMEvent(0));
  ASSERT_TRUE(event);
  std::atomic<int> through{0}, timedOut{0};
  auto waiter = [&] { (event->Wait(5000) == S_OK ? through : timedOut) += 1; };
  std::thread a(waiter), b(waiter);
  event->Set();
  for (auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
       through.load() == 0 && std::chrono::steady_clock::now() < deadline;)
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_EQ(through.load(), 1) << "one Set of an auto-reset event released " << through.load() << " waiters";
  event->Set();
  a.join();
  b.join();
  EXPECT_TRUE(through.load() == 2 && timedOut.load() == 0);
  EXPECT_EQ(event->Wait(20), S_FALSE) << "the event reset itself";
}

TEST(RKMEvent, ManualResetStaysSetUntilReset)
{
  std::unique_ptr<RKMEvent> event(CreateRKMEvent(1));
  ASSERT_TRUE(event);
  const auto before = std::chrono::steady_clock::now();
  EXPECT_EQ(event->Wait(30), S_FALSE);
  EXPECT_GE(std::chrono::steady_clock::now() - before, std::chrono::milliseconds(25));
  event->Set();
  EXPECT_TRUE(event->Wait(0) == S_OK && event->Wait() == S_OK);
  event->Reset();
  EXPECT_EQ(event->Wait(0), S_FALSE);
}

// Without the setting no provider is looked for, whatever the type.
TEST(RKMPolyDebugStackTrace, WithoutTheSettingTracesAreNoOps)
{
  if (RKMGetEnv("RKMPolyDebugStackTrace"))
    GTEST_SKIP() << "the trace setting is in this process's environment";
  RKMPolyDebugStackTrace scope("scope", 11);
  RKMPolyDebugObjectTrace object;
  object.Construct("object", 11);
  EXPECT_FALSE(scope.IsTracing() || object.IsTracing());
  EXPECT_TRUE(RKMPolyDebugStackTrace::s_Create == nullptr && RKMPolyDebugObjectTrace::s_Create == nullptr);
}
}
