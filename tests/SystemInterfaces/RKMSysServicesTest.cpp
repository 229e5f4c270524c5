#include "RKMSysServices.h"
#include "RKMMutex.h"
#include "RKMSysAllocator.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <climits>
#include <csignal>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <mutex>
#include <random>
#include <string>
#include <thread>
#include <vector>

#include <dlfcn.h>

#if defined(__SANITIZE_ADDRESS__)
// Out-of-memory must come back as null here, as it does from the plain allocator, instead of
// being reported as an error by the sanitizer.
extern "C" const char *__asan_default_options() { return "allocator_may_return_null=1"; }
#endif

namespace
{
struct Block
{
  unsigned char *p;
  size_t size;
  unsigned char stamp;
  void Fill() const { std::memset(p, stamp, size); }
  bool Intact() const
  {
    return std::all_of(p, p + size, [&](unsigned char c) { return c == stamp; });
  }
};

// Live blocks must be aligned for any fundamental type, disjoint, and hold what was written.
void ExpectAlignedDisjointIntact(std::vector<Block> blocks)
{
  std::sort(blocks.begin(), blocks.end(), [](const Block &a, const Block &b) { return a.p < b.p; });
  for (size_t i = 0; i < blocks.size(); ++i)
  {
    EXPECT_EQ(reinterpret_cast<std::uintptr_t>(blocks[i].p) % alignof(std::max_align_t), 0u) << blocks[i].size;
    EXPECT_TRUE(i + 1 == blocks.size() || blocks[i].p + std::max<size_t>(blocks[i].size, 1) <= blocks[i + 1].p)
        << "overlap";
    EXPECT_TRUE(blocks[i].Intact()) << "block of " << blocks[i].size << " bytes overwritten";
  }
}

void Lock(RKMMutex &m) { (m.*RKMMutex::LockF)(); }
void Unlock(RKMMutex &m) { (m.*RKMMutex::UnlockF)(); }
} // namespace

// Aborting, not exiting, is what leaves a core and stops atexit handlers from running on a broken state.
TEST(RKMSysServicesDeathTest, FatalErrorsAbortWithAMessage)
{
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_DEATH(RKMFatalError("Geo", "a.cpp", "Run", "broken", "x=3", 17), "fatal error 17 in Geo.*broken x=3");
  EXPECT_DEATH(RKMQNVnull(), "required pointer is null");
  EXPECT_EXIT(RKMFatalError(nullptr, nullptr, nullptr, nullptr, nullptr, -1), testing::KilledBySignal(SIGABRT),
              "fatal error -1");
  EXPECT_EXIT(RKMQNVnull(), testing::KilledBySignal(SIGABRT), "");
}

// Anything but exactly one int gives the default rather than a truncated or wrapped value.
TEST(RKMSysServices, EnvironmentSettings)
{
  const char *name = "RKM_SYS_TEST_SETTING";
  ASSERT_EQ(setenv(name, "hello", 1), 0);
  EXPECT_STREQ(RKMGetEnv(name), "hello");
  EXPECT_EQ(RKMGetEnv(nullptr), nullptr);
  for (int v : {42, -7, 0, INT_MAX, INT_MIN})
  {
    ASSERT_EQ(setenv(name, std::to_string(v).c_str(), 1), 0);
    EXPECT_EQ(RKMMathDebug::_integerGetEnv(name, 3), v);
  }
  for (const char *bad : {"2147483648", "-2147483649", "99999999999999999999", "12abc", "3 ", "", "1.5", "0x10"})
  {
    ASSERT_EQ(setenv(name, bad, 1), 0);
    EXPECT_EQ(RKMMathDebug::_integerGetEnv(name, 3), 3) << '"' << bad << '"';
  }
  unsetenv(name);
  EXPECT_EQ(RKMGetEnv(name), nullptr);
  EXPECT_TRUE(RKMMathDebug::_integerGetEnv(name, 5) == 5 && RKMMathDebug::_integerGetEnv(name) == 0 &&
              RKMMathDebug::_integerGetEnv(nullptr, 8) == 8);
}

TEST(RKMSysServices, RawBlocksAndDynamicFunctions)
{
  Block b{static_cast<unsigned char *>(RKMQNVemBook(1000, 3)), 1000, 0xAB};
  ASSERT_NE(b.p, nullptr);
  b.Fill();
  RKMQNVemClear(b.p);
  void *z = RKMQNVemBook(0);
  EXPECT_NE(z, nullptr) << "a zero-size request still gives a block";
  RKMQNVemClear(z);
  EXPECT_EQ(RKMQNVemBook(SIZE_MAX), nullptr);
  RKMQNVemClear(nullptr);

  // The library finds its own RKMGetEnv, by its mangled name, through the path it was loaded from.
  Dl_info info{};
  ASSERT_NE(dladdr(reinterpret_cast<void *>(&RKMGetEnv), &info), 0);
  auto *getEnv =
      reinterpret_cast<const char *(*)(const char *)>(RKMQNVDynamicFunction(info.dli_fname, "_Z9RKMGetEnvPKc"));
  auto *len = reinterpret_cast<size_t (*)(const char *)>(RKMQNVDynamicFunction("libc.so.6", "strlen"));
  ASSERT_TRUE(getEnv && len);
  setenv("RKM_SYS_TEST_DYN", "found", 1);
  EXPECT_STREQ(getEnv("RKM_SYS_TEST_DYN"), "found");
  EXPECT_EQ(len("abcd"), 4u);
  // "BrokenLocale" must be tried as libBrokenLocale.so, which every C development install has; dlopen of
  // "" would search the whole process.
  EXPECT_NE(RKMQNVDynamicFunction("BrokenLocale", "__ctype_get_mb_cur_max"), nullptr);
  for (const auto &[library, symbol] : {std::pair<const char *, const char *>{"libc.so.6", "rkm_no_such_symbol"},
                                        {"rkm_no_such_library", "strlen"},
                                        {nullptr, "strlen"},
                                        {"", "strlen"},
                                        {"libc.so.6", ""}})
    EXPECT_EQ(RKMQNVDynamicFunction(library, symbol), nullptr) << (library ? library : "null") << " " << symbol;
}

// Store-buffering litmus: with a full fence between each side's store and load, at least one side sees
// the other's store. With a mere compiler barrier x86 usually shows both missing in some rounds.
TEST(RKMSysServices, MemoryBarrierForbidsStoreLoadReordering)
{
  std::atomic<int> x{0}, y{0}, arrived{0};
  int seen[2] = {1, 1}, bothMissed = 0;
  auto barrier = [&](int target)
  {
    arrived.fetch_add(1);
    for (int spin = 0; arrived.load() < target; ++spin)
      if (spin > 1000)
        std::this_thread::yield();
  };
  auto side = [&](int me)
  {
    std::atomic<int> &mine = me ? x : y, &other = me ? y : x;
    for (int i = 0; i < 20000; ++i)
    {
      barrier(4 * i + 2);
      for (volatile int d = (i * 7 + me * 13) % 200; d > 0; d = d - 1)
      {
      } // vary the skew between the sides
      mine.store(1, std::memory_order_relaxed);
      PQZMemoryBarrier();
      seen[me] = other.load(std::memory_order_relaxed);
      barrier(4 * i + 4);
      if (me == 0)
      {
        bothMissed += seen[0] == 0 && seen[1] == 0;
        x = y = 0;
      }
    }
  };
  std::thread peer(side, 1);
  side(0);
  peer.join();
  EXPECT_EQ(bothMissed, 0);
}

// Recursive for its owner, exclusive against the others; nested locking keeps a split
// read-modify-write, which widens any race, exact.
TEST(RKMMutex, RecursiveAndExclusiveAcrossThreads)
{
  RKMMutex m(1, 2, 3);
  EXPECT_EQ(m.Lock(), S_OK);
  Lock(m);
  std::atomic<bool> entered{false};
  std::thread other(
      [&]
      {
        Lock(m);
        entered = true;
        Unlock(m);
      });
  Unlock(m);
  std::this_thread::sleep_for(std::chrono::milliseconds(50));
  EXPECT_FALSE(entered) << "one unlock of two must keep the mutex held";
  EXPECT_EQ(m.Unlock(), S_OK);
  other.join();
  EXPECT_TRUE(entered);
  long counter = 0;
  std::vector<std::thread> threads;
  for (int t = 0; t < 4; ++t)
    threads.emplace_back(
        [&]
        {
          for (int i = 0; i < 20000; ++i)
          {
            Lock(m);
            Lock(m);
            const long v = counter;
            PQZMemoryBarrier();
            counter = v + 1;
            Unlock(m);
            Unlock(m);
          }
        });
  for (std::thread &t : threads)
    t.join();
  EXPECT_EQ(counter, 80000);
}

// Blocks of every size class, from pools and not, returned to any pool; sizes near SIZE_MAX would wrap
// when rounded up to a size class, and give null instead.
TEST(RKMSysAllocator, PoolsBlocksAndHugeSizes)
{
  // Pools live for the whole process; static keeps them reachable for the leak checker.
  static RKMSysPool *pool = RKMSysCreatePool(0, 0, "geometry"), *fixed = RKMSysCreatePool(0, 200, "fixed"),
                    *unnamed = RKMSysCreatePool(0, 0, nullptr), *huge = RKMSysCreatePool(0, SIZE_MAX, "huge");
  ASSERT_TRUE(pool && fixed && unnamed);
  EXPECT_STREQ(RKMSysGetPoolName(pool), "geometry");
  EXPECT_STREQ(RKMSysGetPoolName(unnamed), "");
  EXPECT_EQ(RKMSysGetPoolName(nullptr), nullptr);
  std::vector<Block> live;
  unsigned char stamp = 1;
  for (size_t size : {0, 1, 15, 16, 17, 31, 33, 100, 511, 512, 513, 4096, 100000})
    for (RKMSysPool *from : {pool, static_cast<RKMSysPool *>(nullptr), pool})
      live.push_back({static_cast<unsigned char *>(RKMSpecializedNew(size, from)), size, stamp++});
  for (int i = 0; i < 8; ++i) // a pool's block size is served however little is asked
    live.push_back({static_cast<unsigned char *>(RKMSpecializedNew(1, fixed)), 200, stamp++});
  for (const Block &b : live)
  {
    ASSERT_NE(b.p, nullptr) << b.size;
    b.Fill();
  }
  ExpectAlignedDisjointIntact(live);
  for (size_t i = 0; i < live.size(); ++i)
    RKMSpecializedDelete(live[i].p, i % 2 ? nullptr : fixed); // the pool named on return does not matter
  RKMSpecializedDelete(nullptr, pool);
  for (size_t size : {SIZE_MAX - 15, SIZE_MAX - 16, SIZE_MAX / 2, size_t(1) << 62, SIZE_MAX})
    EXPECT_EQ(RKMSpecializedNew(size, size == SIZE_MAX ? nullptr : pool), nullptr) << size;
  EXPECT_EQ(RKMSpecializedNew(1, huge), nullptr);
}

TEST(RKMSysAllocator, ConcurrentUseFromSeveralThreads)
{
  const unsigned seed = 8080;
  static RKMSysPool *pool = RKMSysCreatePool(0, 0, "threads");
  std::mutex lock;
  std::vector<Block> survivors;
  int corrupt = 0;
  std::vector<std::thread> threads;
  for (unsigned t = 0; t < 4; ++t)
    threads.emplace_back(
        [&, t]
        {
          std::mt19937 rng(seed + t);
          std::vector<Block> mine;
          int bad = 0;
          for (int i = 0; i < 4000; ++i)
            if (mine.empty() || rng() % 3)
            {
              const size_t size = rng() % 1100;
              Block b{static_cast<unsigned char *>(RKMSpecializedNew(size, rng() % 2 ? pool : nullptr)), size,
                      static_cast<unsigned char>(rng())};
              bad += !b.p;
              if (b.p)
                b.Fill(), mine.push_back(b);
            }
            else
            {
              const size_t k = rng() % mine.size();
              bad += !mine[k].Intact();
              RKMSpecializedDelete(mine[k].p, pool);
              mine[k] = mine.back();
              mine.pop_back();
            }
          std::lock_guard<std::mutex> guard(lock);
          survivors.insert(survivors.end(), mine.begin(), mine.end());
          corrupt += bad;
        });
  for (std::thread &t : threads)
    t.join();
  EXPECT_EQ(corrupt, 0) << "seed " << seed << ": blocks lost or overwritten by another thread";
  EXPECT_GT(survivors.size(), 1000u);
  ExpectAlignedDisjointIntact(survivors);
  for (const Block &b : survivors) // returned by a thread other than the one that took them
    RKMSpecializedDelete(b.p);
}
