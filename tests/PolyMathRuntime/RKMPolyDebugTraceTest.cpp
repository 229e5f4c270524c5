// Runs with RKMPolyDebugStackTrace=1 and RKMPolyDebugStackTraceMask=9 (type mask 1, class mask 8) and the
// test provider on the library path; see CMakeLists.txt. Types 9 and 11 are traced; 5 has the type bit but
// not the class bit, 8 the reverse, 2 neither.

#include "RKMPolyDebugObjectTrace.h"
#include "RKMPolyDebugStackTrace.h"
#include "RKMSysServices.h"

#include "RuntimeTestSupport.h"
#include "TraceProviderLog.h"

#include <map>
#include <string>

#include <dlfcn.h>

namespace
{
#define REQUIRE_TRACE_SETTINGS()                                                                                  \
  if (!RKMGetEnv("RKMPolyDebugStackTrace") || !RKMGetEnv("RKMPolyDebugStackTraceMask") ||                         \
      std::atoi(RKMGetEnv("RKMPolyDebugStackTraceMask")) != 9)                                                   \
  GTEST_SKIP() << "run through ctest, which sets the trace settings and the provider's path"

// Moves the provider's log out (loading the provider first, if no trace has). The library loads it
// privately (RTLD_LOCAL); opening it again by the same name without loading gives that very instance.
std::vector<TraceProviderRecord> TakeLog()
{
  RKMPolyDebugStackTrace::Initialize();
  std::vector<TraceProviderRecord> log;
  void *lib = dlopen("libPolyDebugStackTrace.so", RTLD_NOW | RTLD_NOLOAD);
  auto take = lib ? reinterpret_cast<TraceProviderTakeLogFn>(dlsym(lib, "TraceProviderTakeLog")) : nullptr;
  if (!take)
    ADD_FAILURE() << "the trace provider is not loaded";
  TraceProviderRecord chunk[256];
  for (int n; take && (n = take(chunk, 256)) > 0;)
    log.insert(log.end(), chunk, chunk + n);
  if (lib)
    dlclose(lib);
  return log;
}

// Every opened event is closed exactly once, after its open, through the entry that opened it, and nothing
// else is closed. Gives the number of events opened.
int ExpectEachOpenClosedOnce(const std::vector<TraceProviderRecord> &log)
{
  std::map<long, std::pair<const TraceProviderRecord *, int>> events; // the open and the number of closes
  for (const TraceProviderRecord &r : log)
  {
    auto &e = events[r.handle];
    EXPECT_TRUE(r.open ? !e.first && (e.first = &r) : e.first && e.first->fromObjectTrace == r.fromObjectTrace && ++e.second)
        << (r.open ? "reopens" : "closes, before its open or through the other entry,") << " event " << r.handle;
  }
  int opened = 0;
  for (const auto &e : events)
    EXPECT_TRUE(e.second.first && e.second.second == 1 && ++opened)
        << "event " << e.first << " (-1: closed before, 0: bad call) closed " << e.second.second << " times";
  return opened;
}

// The trace settings are in the environment and the provider's log is empty.
class RKMPolyDebugTrace : public ::testing::Test
{
protected:
  void SetUp() override
  {
    REQUIRE_TRACE_SETTINGS();
    TakeLog();
  }
};

// Declared first, so it runs first: an object trace made before any stack trace must still filter with the
// mask setting. Then several threads trace at once: whichever reads the settings, under a once-flag, every
// thread must see the loaded provider and the masks, and reading them must not race.
TEST(RKMPolyDebugTraceFirstUse, SettingsReadOnceForObjectAndStackTracesOnAnyThread)
{
  REQUIRE_TRACE_SETTINGS();
  rkmtest::Watchdog watchdog;
  {
    RKMPolyDebugObjectTrace object;
    object.Construct("excluded by the mask", 5);
    EXPECT_FALSE(object.IsTracing());
  }
  constexpr int kThreads = 6;
  std::atomic<int> wrong{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    RKMPolyDebugStackTrace trace("first", 9);
    RKMPolyDebugObjectTrace object;
    object.Construct("excluded by the mask", t % 2 ? 5 : 8);
    wrong += !trace.IsTracing() || object.IsTracing();
  });
  EXPECT_EQ(wrong.load(), 0);
  EXPECT_TRUE(RKMPolyDebugStackTrace::s_TypeMask == 1 && RKMPolyDebugStackTrace::s_ClassMask == 8);
  EXPECT_EQ(ExpectEachOpenClosedOnce(TakeLog()), kThreads);
}

// Copies hold no event; assignment neither takes the source's event nor drops the target's own. Scopes end
// in reverse order, each closing its own event.
TEST_F(RKMPolyDebugTrace, MaskSelectsTheTracedScopesAndOnlyTheirOwnersCloseThem)
{
  {
    RKMPolyDebugStackTrace nine("nine", 9), eleven("eleven", 11), five("five", 5), eight("eight", 8), two("two", 2);
    EXPECT_TRUE(nine.IsTracing() && eleven.IsTracing());
    EXPECT_FALSE(five.IsTracing() || eight.IsTracing() || two.IsTracing());
    RKMPolyDebugStackTrace copy(nine);
    std::vector<RKMPolyDebugStackTrace> copies(3, nine);
    eleven = nine;
    copy = eleven;
    EXPECT_TRUE(eleven.IsTracing() && !copy.IsTracing() && !copies[0].IsTracing() && !copies[2].IsTracing());
  }
  const std::vector<TraceProviderRecord> log = TakeLog();
  ASSERT_EQ(log.size(), 4u);
  EXPECT_TRUE(log[0].type == 9 && std::string(log[0].name) == "nine");
  EXPECT_TRUE(log[1].type == 11 && std::string(log[1].name) == "eleven");
  EXPECT_TRUE(log[2].handle == log[1].handle && log[3].handle == log[0].handle);
  EXPECT_EQ(ExpectEachOpenClosedOnce(log), 2);
}

// Constructing again closes the open event before opening the next; copies hold none.
TEST_F(RKMPolyDebugTrace, ObjectTraceConstructOpensThroughTheObjectEntry)
{
  {
    RKMPolyDebugObjectTrace object;
    EXPECT_FALSE(object.IsTracing());
    const std::pair<const char *, int> constructs[] = {{"first", 9}, {"second", 11}, {"untraced", 5}, {"last", 9}};
    for (const auto &c : constructs)
    {
      object.Construct(c.first, c.second);
      EXPECT_EQ(object.IsTracing(), c.second != 5) << c.first;
      RKMPolyDebugObjectTrace copy(object), assigned;
      assigned = object;
      EXPECT_FALSE(copy.IsTracing() || assigned.IsTracing());
    }
  }
  const std::vector<TraceProviderRecord> log = TakeLog();
  ASSERT_EQ(log.size(), 6u);
  const char *opened[] = {"first", nullptr, "second", nullptr, "last", nullptr};
  for (size_t i = 0; i < log.size(); ++i)
    EXPECT_TRUE(log[i].fromObjectTrace == 1 && (log[i].open ? opened[i] && std::string(log[i].name) == opened[i] : !opened[i])) << i;
  EXPECT_EQ(ExpectEachOpenClosedOnce(log), 3);
}

// Nested scopes, copies and object traces on several threads at once: each event is closed once, by its
// owner, whatever the interleaving.
TEST_F(RKMPolyDebugTrace, ConcurrentScopesCloseEachEventOnce)
{
  rkmtest::Watchdog watchdog;
  constexpr int kThreads = 4, kRounds = 300;
  std::atomic<int> wrong{0};
  rkmtest::RunConcurrently(kThreads, [&](int t) {
    for (int r = 0; r < kRounds; ++r)
    {
      RKMPolyDebugStackTrace outer("outer", (r + t) % 2 ? 9 : 11), copy(outer), skipped("skipped", 5);
      RKMPolyDebugObjectTrace object;
      object.Construct("object", 9);
      RKMPolyDebugObjectTrace objectCopy(object);
      wrong += !outer.IsTracing() || copy.IsTracing() || skipped.IsTracing() || !object.IsTracing() || objectCopy.IsTracing();
    }
  });
  EXPECT_EQ(wrong.load(), 0);
  EXPECT_EQ(ExpectEachOpenClosedOnce(TakeLog()), 2 * kThreads * kRounds);
}
}
