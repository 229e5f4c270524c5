#include "RKMPolyLittleTimer.h"
#include "RKMPolyScopedMutex.h"

#include "RKMInterlocked.h"
#include "RKMMutex.h"
#include "RKMSysServices.h"

#include <chrono>
#include <new>

int RKMPolyLittleTimer::s_id = 0;

namespace
{
std::int64_t Now()
{
  return std::chrono::duration_cast<std::chrono::nanoseconds>(std::chrono::steady_clock::now().time_since_epoch())
      .count();
}

// The steady clock counts nanoseconds: a million ticks per millisecond.
constexpr double kTicksPerMillisecond = 1e6;
}

RKMMutex &RKMPolyLittleTimer::s_m()
{
  // Built on first use, which is thread-safe, so no caller can find it unconstructed.
  static RKMMutex mutex(0, 1, 0);
  return mutex;
}

RKMPolyLittleTimer::RKMPolyLittleTimer(unsigned char flag)
    : m_ticksPerMillisecond(kTicksPerMillisecond), m_flag(flag), m_id(RKMInterlockedIncrement(&s_id))
{
}

void RKMPolyLittleTimer::start(int v)
{
  m_start = Now();
  ++m_nbCalls;
  m_value += static_cast<unsigned>(v);
}

void RKMPolyLittleTimer::stop(int v)
{
  m_stop = Now();
  m_value += static_cast<unsigned>(v);
  // Without a start, or without a tick rate, there is no elapsed time to add.
  if (m_start != 0 && m_ticksPerMillisecond > 0.0)
    m_totalTime += static_cast<double>(m_stop - m_start) / m_ticksPerMillisecond;
}

void RKMPolyLittleTimer::Reset()
{
  m_totalTime = 0.0;
  m_nbCalls = 0;
  m_value = 0;
}

RKMPolyLittleTimer *RKMGetPolyLittleTimer(void *&slot)
{
  if (void *t = __atomic_load_n(&slot, __ATOMIC_ACQUIRE))
    return static_cast<RKMPolyLittleTimer *>(t);
  RKMPolyScopedMutex lock(RKMPolyLittleTimer::s_m());
  void *t = __atomic_load_n(&slot, __ATOMIC_ACQUIRE);
  if (!t)
  {
    t = new (std::nothrow) RKMPolyLittleTimer(0);
    __atomic_store_n(&slot, t, __ATOMIC_RELEASE);
  }
  return static_cast<RKMPolyLittleTimer *>(t);
}
