#pragma once

#include "RKMExport.h"

/// An event of the optional trace provider; opaque here.
struct RKMPolyDebugStackTraceEvent;

/// The provider's entry point: opens an event (name, null, type) or closes one (null, event, 0).
typedef RKMPolyDebugStackTraceEvent *(*RKMPolyDebugTraceCreate)(const char *name,
                                                                RKMPolyDebugStackTraceEvent *event, int type);

/// A trace scope: opens a provider event when built, closes it when destroyed. Without the setting
/// "RKMPolyDebugStackTrace", or without the provider library, every scope is a no-op. The setting
/// "RKMPolyDebugStackTraceMask" selects the traced types: a scope is traced when its type shares a bit
/// with both masks. A copy holds no event, so only the original closes it.
class RKM_EXPORT RKMPolyDebugStackTrace
{
public:
  explicit RKMPolyDebugStackTrace(const char *name = nullptr, int type = 5);
  RKMPolyDebugStackTrace(const RKMPolyDebugStackTrace &) : m_event(nullptr) {}
  RKMPolyDebugStackTrace &operator=(const RKMPolyDebugStackTrace &) { return *this; }
  ~RKMPolyDebugStackTrace();

  /// True when this scope holds an open event.
  unsigned char IsTracing() const { return m_event != nullptr; }

  /// Loads the provider and reads the mask once per process; later calls do nothing.
  static void Initialize();
  static RKMPolyDebugTraceCreate s_Create;
  /// The two low bits of the mask setting (3 without it).
  static int s_TypeMask;
  /// The other bits of the mask setting (all but the two low ones without it).
  static int s_ClassMask;

private:
  RKMPolyDebugStackTraceEvent *m_event;
};
