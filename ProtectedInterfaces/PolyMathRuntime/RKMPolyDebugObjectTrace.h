#pragma once

#include "RKMExport.h"
#include "RKMPolyDebugStackTrace.h"

/// An object trace: Construct opens a provider event, the destructor closes it. Filters with the masks
/// of RKMPolyDebugStackTrace. A copy holds no event, so only the original closes it.
class RKM_EXPORT RKMPolyDebugObjectTrace
{
public:
  RKMPolyDebugObjectTrace() : m_event(nullptr) {}
  RKMPolyDebugObjectTrace(const RKMPolyDebugObjectTrace &) : m_event(nullptr) {}
  RKMPolyDebugObjectTrace &operator=(const RKMPolyDebugObjectTrace &) { return *this; }
  ~RKMPolyDebugObjectTrace();

  /// Opens the event when the provider is loaded and the type passes both masks. An event already open
  /// is closed first.
  void Construct(const char *name, int type);
  unsigned char IsTracing() const { return m_event != nullptr; }

  static RKMPolyDebugTraceCreate s_Create;

private:
  RKMPolyDebugStackTraceEvent *m_event;
};
