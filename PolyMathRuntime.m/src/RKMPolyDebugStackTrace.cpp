#include "RKMPolyDebugObjectTrace.h"
#include "RKMPolyDebugStackTrace.h"

#include "RKMSysServices.h"

#include <cstdlib>
#include <mutex>

RKMPolyDebugTraceCreate RKMPolyDebugStackTrace::s_Create = nullptr;
int RKMPolyDebugStackTrace::s_TypeMask = 3;
int RKMPolyDebugStackTrace::s_ClassMask = ~3;
RKMPolyDebugTraceCreate RKMPolyDebugObjectTrace::s_Create = nullptr;

namespace
{
const char kSetting[] = "RKMPolyDebugStackTrace";
const char kMaskSetting[] = "RKMPolyDebugStackTraceMask";
const char kProvider[] = "PolyDebugStackTrace";

// The entry points and masks are written once, under call_once, before any trace reads them: the
// happens-before of call_once makes the later unlocked reads race-free.
std::once_flag g_stackOnce, g_objectOnce;

RKMPolyDebugTraceCreate LoadProvider(const char *symbol)
{
  if (!RKMGetEnv(kSetting))
    return nullptr;
  return reinterpret_cast<RKMPolyDebugTraceCreate>(RKMQNVDynamicFunction(kProvider, symbol));
}

bool Traced(int type)
{
  return (type & RKMPolyDebugStackTrace::s_TypeMask) != 0 && (type & RKMPolyDebugStackTrace::s_ClassMask) != 0;
}
}

void RKMPolyDebugStackTrace::Initialize()
{
  std::call_once(g_stackOnce, [] {
    if (!s_Create)
      s_Create = LoadProvider("CreateStackTraceEventFunction");
    if (const char *mask = RKMGetEnv(kMaskSetting))
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
  if (s_Create && Traced(type))
    m_event = s_Create(name, nullptr, type);
}

RKMPolyDebugStackTrace::~RKMPolyDebugStackTrace()
{
  if (s_Create && m_event)
    s_Create(nullptr, m_event, 0);
  m_event = nullptr;
}

void RKMPolyDebugObjectTrace::Construct(const char *name, int type)
{
  // The masks are read once, before their first use by either kind of trace: read only by stack
  // traces, an object trace made first would filter with the defaults, and race with the reading.
  RKMPolyDebugStackTrace::Initialize();
  std::call_once(g_objectOnce, [] {
    if (!s_Create)
      s_Create = LoadProvider("CreateObjectTraceEventFunction");
  });
  if (s_Create && m_event)
    s_Create(nullptr, m_event, 0);
  m_event = nullptr;
  if (s_Create && Traced(type))
    m_event = s_Create(name, nullptr, type);
}

RKMPolyDebugObjectTrace::~RKMPolyDebugObjectTrace()
{
  if (s_Create && m_event)
    s_Create(nullptr, m_event, 0);
  m_event = nullptr;
}
