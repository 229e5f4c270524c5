#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <future>
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

// A deadlock in the code under test must fail the run, not stall it: past the deadline the process aborts.
class Watchdog
{
public:
  explicit Watchdog(std::chrono::seconds limit = std::chrono::seconds(30))
      : m_thread([limit, done = m_done.get_future()] {
          if (done.wait_for(limit) != std::future_status::ready)
            std::fprintf(stderr, "Watchdog: the test still runs after %lld s\n", static_cast<long long>(limit.count())), std::abort();
        })
  {
  }
  ~Watchdog()
  {
    m_done.set_value();
    m_thread.join();
  }

private:
  std::promise<void> m_done;
  std::thread m_thread;
};

// Runs body(index) on n threads released together, so that they really contend instead of running one
// after the other while the later ones are still being created.
inline void RunConcurrently(int n, const std::function<void(int)> &body)
{
  std::atomic<int> ready{0};
  std::vector<std::thread> threads;
  for (int i = 0; i < n; ++i)
    threads.emplace_back([&, i] {
      for (ready.fetch_add(1); ready.load() < n;)
        std::this_thread::yield();
      body(i);
    });
  for (std::thread &t : threads)
    t.join();
}
}
