#include "RKMPolyDebugObjectTrace.h"
#include "RKMPolyDebugTraceProvider.h"

#include <mutex>

RKMPolyDebugTraceCreate RKMPolyDebugObjectTrace::s_Create = nullptr;

namespace
{
// The entry point is written once, under call_once, before any object trace reads it.
std::once_flag g_once;
}

void RKMPolyDebugObjectTrace::Construct(const char *name, int type)
{
  // The masks are read once, before their first use by either kind of trace: read only by stack
  // traces, an object trace made first would filter with the defaults, and race with the reading.
  RKMPolyDebugStackTrace::Initialize();
  std::call_once(g_once, [] {
    if (!s_Create)
      s_Create = RKMPolyDebugTraceProvider::Load("CreateObjectTraceEventFunction");
  });
  if (s_Create && m_event)
    s_Create(nullptr, m_event, 0);
  m_event = nullptr;
  if (s_Create && RKMPolyDebugTraceProvider::Traced(type))
    m_event = s_Create(name, nullptr, type);
}

RKMPolyDebugObjectTrace::~RKMPolyDebugObjectTrace()
{
  if (s_Create && m_event)
    s_Create(nullptr, m_event, 0);
  m_event = nullptr;
}
