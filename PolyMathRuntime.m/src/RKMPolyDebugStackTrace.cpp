#include "RKMPolyDebugStackTrace.h"
#include "RKMPolyDebugTraceProvider.h"

#include "RKMSysServices.h"

#include <cstdlib>
#include <mutex>

RKMPolyDebugTraceCreate RKMPolyDebugStackTrace::s_Create = nullptr;
int RKMPolyDebugStackTrace::s_TypeMask = 3;
int RKMPolyDebugStackTrace::s_ClassMask = ~3;

namespace
{
// The entry point and the masks are written once, under call_once, before any trace reads them: the
// happens-before of call_once makes the later unlocked reads race-free.
std::once_flag g_once;
}

void RKMPolyDebugStackTrace::Initialize()
{
  std::call_once(g_once, [] {
    if (!s_Create)
      s_Create = RKMPolyDebugTraceProvider::Load("CreateStackTraceEventFunction");
    if (const char *mask = RKMGetEnv("RKMPolyDebugStackTraceMask"))
    {
      const int m = std::atoi(mask);
      s_TypeMask = m & 3;
      s_ClassMask = m & ~3;
    }
  });
}

RKMPolyDebugStackTrace::RKMPolyDebugStackTrace(const char *name, int type) : m_event(nullptr)
{
  Initialize();
  if (s_Create && RKMPolyDebugTraceProvider::Traced(type))
    m_event = s_Create(name, nullptr, type);
}

RKMPolyDebugStackTrace::~RKMPolyDebugStackTrace()
{
  if (s_Create && m_event)
    s_Create(nullptr, m_event, 0);
  m_event = nullptr;
}
