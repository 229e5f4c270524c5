// Runs with RKMPolyDebugStackTrace=1 and RKMPolyDebugStackTraceMask=9 (type mask 1, class mask 8) and
// the test provider on the library path; see CMakeLists.txt.

#include "RKMPolyDebugObjectTrace.h"
#include "RKMPolyDebugStackTrace.h"
#include "RKMSysServices.h"

#include "RuntimeTestSupport.h"
#include "TraceProviderLog.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <map>
#include <string>
#include <vector>

#include <dlfcn.h>

namespace
{
#define REQUIRE_TRACE_SETTINGS()                                                                            \
  if (!RKMGetEnv("RKMPolyDebugStackTrace") || !RKMGetEnv("RKMPolyDebugStackTraceMask") ||                   \
      std::atoi(RKMGetEnv("RKMPolyDebugStackTraceMask")) != 9)                                             \
  GTEST_SKIP() << "run through ctest, which sets the trace settings and the provider's path"

// Moves the provider's log out. The library loads the provider privately (RTLD_LOCAL); opening it
// again by the same name without loading gives that very instance.
std::vector<TraceProviderRecord> TakeLog()
{
  std::vector<TraceProviderRecord> log;
  void *lib = dlopen("libPolyDebugStackTrace.so", RTLD_NOW | RTLD_NOLOAD);
  auto take = lib ? reinterpret_cast<TraceProviderTakeLogFn>(dlsym(lib, "TraceProviderTakeLog")) : nullptr;
  if (!take)
  {
    ADD_FAILURE() << "the trace provider is not loaded";
    return log;
  }
  TraceProviderRecord chunk[256];
  for (int n; (n = take(chunk, 256)) > 0;)
    log.insert(log.end(), chunk, chunk + n);
  dlclose(lib);
  return log;
}

void StartLog()
{
  RKMPolyDebugStackTrace::Initialize();
  TakeLog();
}

// Every opened event is closed exactly once, after its open, through the entry that opened it, and
// nothing else is closed. Gives the number of events opened.
int ExpectEachOpenClosedOnce(const std::vector<TraceProviderRecord> &log)
{
  std::map<long, size_t> openedAt;
  std::map<long, int> closes;
  for (size_t i = 0; i < log.size(); ++i)
  {
    const TraceProviderRecord &r = log[i];
    if (r.open)
    {
      EXPECT_TRUE(openedAt.emplace(r.handle, i).second) << "handle reused";
      continue;
    }
    auto it = openedAt.find(r.handle);
    if (it == openedAt.end())
    {
      ADD_FAILURE() << "record " << i << " closes event " << r.handle
                    << " (-1: closed before, 0: bad call, other: not opened yet)";
      continue;
    }
    EXPECT_EQ(r.fromObjectTrace, log[it->second].fromObjectTrace) << "closed through the other entry";
    ++closes[r.handle];
  }
  for (const auto &o : openedAt)
    EXPECT_EQ(closes[o.first], 1) << "event " << o.first << " (" << log[o.second].name << ")";
  return static_cast<int>(openedAt.size());
}

// The first-use cases mean something only before any other trace: their suite is declared first, so
// it runs first. An object trace made before any stack trace must still filter with the mask setting
// (type 5 is not traced under mask 9), and reading the masks must not race with a stack trace reading
// them on another thread.
TEST(RKMPolyDebugTraceFirstUse, ObjectTraceHonoursTheMaskSetting)
{
  REQUIRE_TRACE_SETTINGS();
  rkmtest::Watchdog watchdog;
  {
    RKMPolyDebugObjectTrace object;
    object.Construct("excluded by the mask", 5);
    EXPECT_FALSE(object.IsTracing());
  }
  std::atomic<int> wrong{0};
  rkmtest::RunConcurrently(2, [&](int t) {
    if (t == 1)
    {
      RKMPolyDebugStackTrace scope("scope", 9);
      return;
    }
    RKMPolyDebugObjectTrace object;
    object.Construct("excluded by the mask", 5);
    wrong += object.IsTracing();
  });
  EXPECT_EQ(wrong.load(), 0);
}

// The settings are read under a once-flag by whichever thread comes first; every thread must see the
// loaded provider and the masks.
TEST(RKMPolyDebugTraceFirstUse, StackTracesFromSeveralThreads)
{
  REQUIRE_TRACE_SETTINGS();
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 6;
  std::atomic<int> tracing{0};
  rkmtest::RunConcurrently(kThreads, [&](int) {
    RKMPolyDebugStackTrace trace("first", 9);
    tracing += trace.IsTracing();
  });
  EXPECT_EQ(tracing.load(), kThreads);
  EXPECT_EQ(RKMPolyDebugStackTrace::s_TypeMask, 1);
  EXPECT_EQ(RKMPolyDebugStackTrace::s_ClassMask, 8);
  const std::vector<TraceProviderRecord> log = TakeLog();
  ExpectEachOpenClosedOnce(log);
  int opened = 0;
  for (const TraceProviderRecord &r : log)
    opened += r.open && std::string(r.name) == "first";
  EXPECT_EQ(opened, kThreads);
}

TEST(RKMPolyDebugStackTrace, MaskSelectsTheTracedScopes)
{
  REQUIRE_TRACE_SETTINGS();
  StartLog();
  {
    RKMPolyDebugStackTrace nine("nine", 9), eleven("eleven", 11);
    // 5 has the type bit but not the class bit, 8 the reverse, 2 neither.
    RKMPolyDebugStackTrace five("five", 5), eight("eight", 8), two("two", 2);
    EXPECT_TRUE(nine.IsTracing());
    EXPECT_TRUE(eleven.IsTracing());
    EXPECT_FALSE(five.IsTracing() || eight.IsTracing() || two.IsTracing());
  }
  const std::vector<TraceProviderRecord> log = TakeLog();
  ASSERT_EQ(log.size(), 4u);
  EXPECT_STREQ(log[0].name, "nine");
  EXPECT_EQ(log[0].type, 9);
  EXPECT_STREQ(log[1].name, "eleven");
  EXPECT_EQ(log[1].type, 11);
  // Scopes end in reverse order, each closing its own event.
  EXPECT_EQ(log[2].handle, log[1].handle);
  EXPECT_EQ(log[3].handle, log[0].handle);
  EXPECT_EQ(ExpectEachOpenClosedOnce(log), 2);
}

TEST(RKMPolyDebugStackTrace, CopiesHoldNoEvent)
{
  REQUIRE_TRACE_SETTINGS();
  StartLog();
  std::vector<TraceProviderRecord> log;
  {
    RKMPolyDebugStackTrace original("original", 9);
    {
      RKMPolyDebugStackTrace copy(original);
      std::vector<RKMPolyDebugStackTrace> copies(3, original);
      EXPECT_FALSE(copy.IsTracing() || copies[0].IsTracing() || copies[2].IsTracing());
      // Assignment neither takes the source's event nor drops the target's own.
      RKMPolyDebugStackTrace other("other", 11);
      other = original;
      copy = other;
      EXPECT_TRUE(other.IsTracing());
      EXPECT_FALSE(copy.IsTracing());
    }
    log = TakeLog();
    ASSERT_EQ(log.size(), 3u) << "only 'other' may be closed so far";
    EXPECT_EQ(log[2].handle, log[1].handle);
    EXPECT_TRUE(original.IsTracing());
  }
  const std::vector<TraceProviderRecord> rest = TakeLog();
  log.insert(log.end(), rest.begin(), rest.end());
  EXPECT_EQ(ExpectEachOpenClosedOnce(log), 2);
}

TEST(RKMPolyDebugObjectTrace, ConstructOpensThroughTheObjectEntry)
{
  REQUIRE_TRACE_SETTINGS();
  StartLog();
  {
    RKMPolyDebugObjectTrace object;
    EXPECT_FALSE(object.IsTracing());
    object.Construct("first", 9);
    EXPECT_TRUE(object.IsTracing());
    // Constructing again closes the open event before opening the next.
    object.Construct("second", 11);
    RKMPolyDebugObjectTrace copy(object);
    EXPECT_FALSE(copy.IsTracing());
    copy = object;
    EXPECT_FALSE(copy.IsTracing());
    object.Construct("untraced", 5);
    EXPECT_FALSE(object.IsTracing());
    object.Construct("last", 9);
    EXPECT_TRUE(object.IsTracing());
  }
  const std::vector<TraceProviderRecord> log = TakeLog();
  ASSERT_EQ(log.size(), 6u);
  const char *opened[] = {"first", nullptr, "second", nullptr, "last", nullptr};
  for (size_t i = 0; i < log.size(); ++i)
  {
    EXPECT_EQ(log[i].fromObjectTrace, 1) << i;
    EXPECT_EQ(log[i].open != 0, opened[i] != nullptr) << i;
    EXPECT_STREQ(log[i].open ? log[i].name : nullptr, opened[i]) << i;
  }
  EXPECT_EQ(ExpectEachOpenClosedOnce(log), 3);
}

// Nested scopes, copies and object traces on several threads at once: each event is closed once, by
// its owner, whatever the interleaving.
TEST(RKMPolyDebugStackTrace, ConcurrentScopesCloseEachEventOnce)
{
  REQUIRE_TRACE_SETTINGS();
  rkmtest::Watchdog watchdog;
  StartLog();
  constexpr int kThreads = 4;
  constexpr int kRounds = 300;
  std::atomic<int> wrong{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    for (int r = 0; r < kRounds; ++r)
    {
      RKMPolyDebugStackTrace outer("outer", (r + t) % 2 ? 9 : 11), copy(outer), skipped("skipped", 5);
      RKMPolyDebugObjectTrace object;
      object.Construct("object", 9);
      RKMPolyDebugObjectTrace objectCopy(object);
      wrong += !outer.IsTracing() || copy.IsTracing() || skipped.IsTracing() || !object.IsTracing() ||
               objectCopy.IsTracing();
    }
  });
  EXPECT_EQ(wrong.load(), 0);
  EXPECT_EQ(ExpectEachOpenClosedOnce(TakeLog()), 2 * kThreads * kRounds);
}
}
