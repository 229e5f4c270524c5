// A trace provider for the tests: loaded by the library as libPolyDebugStackTrace.so, it hands out
// numbered events and records every open and close for the tests to read back.

#include "RKMPolyDebugStackTrace.h"
#include "TraceProviderLog.h"

#include <algorithm>
#include <cstring>
#include <deque>
#include <mutex>
#include <vector>

struct RKMPolyDebugStackTraceEvent
{
  long handle;
  bool open;
};

namespace
{
std::mutex g_mutex;
std::vector<TraceProviderRecord> g_log;
// Events live as long as the library, so that a second close reads a closed event, not freed memory.
std::deque<RKMPolyDebugStackTraceEvent> g_events;

RKMPolyDebugStackTraceEvent *Handle(int fromObjectTrace, const char *name, RKMPolyDebugStackTraceEvent *event,
                                    int type)
{
  std::lock_guard<std::mutex> lock(g_mutex);
  TraceProviderRecord r{};
  r.fromObjectTrace = fromObjectTrace;
  r.type = type;
  if (name && !event)
  {
    g_events.push_back({static_cast<long>(g_events.size()) + 1, true});
    event = &g_events.back();
    r.open = 1;
    r.handle = event->handle;
    std::strncpy(r.name, name, sizeof r.name - 1);
  }
  else
  {
    // A second close of one event is recorded with handle -1, a call outside the protocol with 0.
    r.handle = !event || name ? 0 : event->open ? event->handle : -1;
    if (r.handle > 0)
      event->open = false;
    event = nullptr;
  }
  g_log.push_back(r);
  return event;
}
}

extern "C"
{
  __attribute__((visibility("default"))) RKMPolyDebugStackTraceEvent *
  CreateStackTraceEventFunction(const char *name, RKMPolyDebugStackTraceEvent *event, int type)
  {
    return Handle(0, name, event, type);
  }

  __attribute__((visibility("default"))) RKMPolyDebugStackTraceEvent *
  CreateObjectTraceEventFunction(const char *name, RKMPolyDebugStackTraceEvent *event, int type)
  {
    return Handle(1, name, event, type);
  }

  __attribute__((visibility("default"))) int TraceProviderTakeLog(TraceProviderRecord *out, int capacity)
  {
    std::lock_guard<std::mutex> lock(g_mutex);
    const size_t n = std::min(g_log.size(), static_cast<size_t>(std::max(capacity, 0)));
    std::copy(g_log.begin(), g_log.begin() + static_cast<long>(n), out);
    g_log.erase(g_log.begin(), g_log.begin() + static_cast<long>(n));
    return static_cast<int>(n);
  }
}
