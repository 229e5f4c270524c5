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
std::deque<RKMPolyDebugStackTraceEvent> g_events; // never freed: a second close reads a closed event

RKMPolyDebugStackTraceEvent *Handle(int fromObjectTrace, const char *name, RKMPolyDebugStackTraceEvent *event, int type)
{
  std::lock_guard<std::mutex> lock(g_mutex);
  TraceProviderRecord r{fromObjectTrace, name && !event, type, 0, {}};
  if (r.open)
  {
    g_events.push_back({static_cast<long>(g_events.size()) + 1, true});
    r.handle = g_events.back().handle;
    std::strncpy(r.name, name, sizeof r.name - 1);
  }
  else if (event && !name)
    r.handle = event->open ? event->handle : -1, event->open = false;
  g_log.push_back(r);
  return r.open ? &g_events.back() : nullptr;
}
}

#define EXPORTED extern "C" __attribute__((visibility("default")))
EXPORTED RKMPolyDebugStackTraceEvent *CreateStackTraceEventFunction(const char *name, RKMPolyDebugStackTraceEvent *event, int type)
{
  return Handle(0, name, event, type);
}
EXPORTED RKMPolyDebugStackTraceEvent *CreateObjectTraceEventFunction(const char *name, RKMPolyDebugStackTraceEvent *event, int type)
{
  return Handle(1, name, event, type);
}
EXPORTED int TraceProviderTakeLog(TraceProviderRecord *out, int capacity)
{
  std::lock_guard<std::mutex> lock(g_mutex);
  const long n = std::min(static_cast<long>(g_log.size()), static_cast<long>(std::max(capacity, 0)));
  std::copy(g_log.begin(), g_log.begin() + n, out);
  g_log.erase(g_log.begin(), g_log.begin() + n);
  return static_cast<int>(n);
}
