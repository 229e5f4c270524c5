// The system services of the platform layer: environment settings, fatal-error and debug hooks,
// memory fences and run-time symbol lookup, declared together in RKMSysServices.h.

#include "RKMSysServices.h"

#include <atomic>
#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>

#include <dlfcn.h>

const char *RKMGetEnv(const char *name)
{
  if (!name)
    return nullptr;
  return std::getenv(name);
}

void RKMFatalError(const char *module, const char *file, const char *function, const char *message,
                   const char *detail, int number)
{
  auto text = [](const char *s) { return s ? s : ""; };
  std::fprintf(stderr, "RKMRezazizuviVaveverodiz fatal error %d in %s (%s, %s): %s %s\n", number, text(module),
               text(file), text(function), text(message), text(detail));
  std::fflush(stderr);
  std::abort();
}

void RKMQNVnull()
{
  std::fputs("RKMRezazizuviVaveverodiz fatal error: a required pointer is null\n", stderr);
  std::fflush(stderr);
  std::abort();
}

void *RKMQNVemBook(size_t size, int)
{
  return std::malloc(size ? size : 1);
}

void RKMQNVemClear(void *block) { std::free(block); }

void *RKMQNVDynamicFunction(const char *library, const char *symbol)
{
  if (!library || !symbol || !*library || !*symbol)
    return nullptr;
  // The candidate names are built in a fixed buffer: the lookup allocates nothing, so it cannot fail
  // for want of memory (destructors call it), and a name too long for the buffer is simply not found.
  static const char *const kForms[] = {"lib%s.so", "%s.so", "%s"};
  for (const char *form : kForms)
  {
    char candidate[512];
    const int length = std::snprintf(candidate, sizeof candidate, form, library);
    if (length < 0 || length >= static_cast<int>(sizeof candidate))
      continue;
    // RTLD_NOLOAD first: a provider already in the process is found without a search of the disk.
    void *handle = dlopen(candidate, RTLD_NOW | RTLD_LOCAL | RTLD_NOLOAD);
    if (!handle)
      handle = dlopen(candidate, RTLD_NOW | RTLD_LOCAL);
    if (!handle)
      continue;
    if (void *f = dlsym(handle, symbol))
      return f;
    dlclose(handle);
  }
  return nullptr;
}

unsigned char RKMQNVDebugAvailable() { return 1; }

void PQZMemoryBarrier() { std::atomic_thread_fence(std::memory_order_seq_cst); }

int RKMMathDebug::_integerGetEnv(const char *name, int defaultValue)
{
  const char *text = RKMGetEnv(name);
  if (!text || !*text)
    return defaultValue;
  char *end = nullptr;
  errno = 0;
  long v = std::strtol(text, &end, 10);
  if (errno != 0 || end == text || *end != '\0' || v < INT_MIN || v > INT_MAX)
    return defaultValue;
  return static_cast<int>(v);
}
