#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace rkmtest
{
// Long runs make lost updates likely in a plain build; ThreadSanitizer reports a race the first time it
// happens, and the long runs would only slow it down.
constexpr int Rounds(int plain)
{
#if defined(__SANITIZE_THREAD__)
  return plain / 5;
#else
  return plain;
#endif
}

// A deadlock in the code under test must fail the run, not stall it: past the deadline the process
// aborts with the name of the test that hung.
class Watchdog
{
public:
  explicit Watchdog(std::chrono::seconds limit = std::chrono::seconds(30))
      : m_thread([this, limit] {
          std::unique_lock<std::mutex> lock(m_mutex);
          if (!m_cv.wait_for(lock, limit, [this] { return m_done; }))
          {
            const ::testing::TestInfo *info = ::testing::UnitTest::GetInstance()->current_test_info();
            std::fprintf(stderr, "Watchdog: %s.%s still running after %lld s, aborting\n",
                         info ? info->test_suite_name() : "?", info ? info->name() : "?",
                         static_cast<long long>(limit.count()));
            std::fflush(stderr);
            std::abort();
          }
        })
  {
  }
  Watchdog(const Watchdog &) = delete;
  Watchdog &operator=(const Watchdog &) = delete;
  ~Watchdog()
  {
    {
      std::lock_guard<std::mutex> lock(m_mutex);
      m_done = true;
    }
    m_cv.notify_one();
    m_thread.join();
  }

private:
  std::mutex m_mutex;
  std::condition_variable m_cv;
  bool m_done = false;
  std::thread m_thread;
};

// Runs body(index) on n threads released together, so that they really contend instead of running one
// after the other while the later ones are still being created.
inline void RunConcurrently(int n, const std::function<void(int)> &body)
{
  std::atomic<int> ready{0};
  std::vector<std::thread> threads;
  threads.reserve(static_cast<size_t>(n));
  for (int i = 0; i < n; ++i)
    threads.emplace_back([&, i] {
      ready.fetch_add(1);
      while (ready.load() < n)
        std::this_thread::yield();
      body(i);
    });
  for (std::thread &t : threads)
    t.join();
}
}
