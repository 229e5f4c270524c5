#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <cstddef>

/// The text of an environment setting, or null when it is not set.
RKM_EXPORT const char *RKMGetEnv(const char *name);

/// Reports an unrecoverable internal error on standard error and aborts the process.
[[noreturn]] RKM_EXPORT void RKMFatalError(const char *module, const char *file, const char *function,
                                           const char *message, const char *detail, int number);

/// Called on a null required pointer: reports it on standard error and aborts the process.
[[noreturn]] RKM_EXPORT void RKMQNVnull();

/// A raw block of size bytes, or null when memory runs out. The tag is informational.
RKM_EXPORT void *RKMQNVemBook(size_t size, int tag = 0);
/// Returns a block of RKMQNVemBook; null is ignored.
RKM_EXPORT void RKMQNVemClear(void *block);

/// Looks up a function by library and symbol name at run time ("Name" is tried as libName.so,
/// Name.so and Name). Null when the library or the symbol is missing; the library stays loaded.
RKM_EXPORT void *RKMQNVDynamicFunction(const char *library, const char *symbol);

/// True when debug settings are honoured.
RKM_EXPORT unsigned char RKMQNVDebugAvailable();

/// A full memory fence.
RKM_EXPORT void PQZMemoryBarrier();

/// Debug settings of the math layer.
class RKM_EXPORT RKMMathDebug
{
public:
  /// The integer value of an environment setting; defaultValue when it is unset or not an integer.
  static int _integerGetEnv(const char *name, int defaultValue = 0);
};
