#pragma once

#include "RKMPolyDebugStackTrace.h"

#include "RKMSysServices.h"

// What the stack traces and the object traces share: the loading of the optional provider and the
// filter by the masks, both read through RKMPolyDebugStackTrace.
namespace RKMPolyDebugTraceProvider
{
/// The provider's entry point of the given symbol; null without the setting or the library.
inline RKMPolyDebugTraceCreate Load(const char *symbol)
{
  if (!RKMGetEnv("RKMPolyDebugStackTrace"))
    return nullptr;
  return reinterpret_cast<RKMPolyDebugTraceCreate>(RKMQNVDynamicFunction("PolyDebugStackTrace", symbol));
}

/// A trace of this type passes both masks.
inline bool Traced(int type)
{
  return (type & RKMPolyDebugStackTrace::s_TypeMask) != 0 && (type & RKMPolyDebugStackTrace::s_ClassMask) != 0;
}
}
