#pragma once

#include "RKMExport.h"

#include <cstdint>

class RKMMutex;

/// Accumulates elapsed time between start and stop calls, in milliseconds, on a steady clock. Not
/// locked: one thread at a time.
class RKM_EXPORT RKMPolyLittleTimer
{
public:
  explicit RKMPolyLittleTimer(unsigned char flag = 0);

  /// Marks the start; counts a call and adds v to the value.
  void start(int v = 0);
  /// Adds the time since the last start (nothing without one) and v to the value.
  void stop(int v = 0);
  void Reset();
  double GetTotalTime() const { return m_totalTime; }
  int GetNbCalls() const { return static_cast<int>(m_nbCalls); }
  int GetValue() const { return static_cast<int>(m_value); }
  unsigned char GetFlag() const { return m_flag; }
  /// 1 for the first timer of the process, then 2, …
  int GetId() const { return m_id; }

  static int s_id;
  static RKMMutex &s_m();

private:
  double m_ticksPerMillisecond;
  std::int64_t m_start = 0;
  std::int64_t m_stop = 0;
  double m_totalTime = 0.0;
  unsigned m_nbCalls = 0;
  unsigned m_value = 0;
  unsigned char m_flag;
  int m_id;
};

/// The timer held in slot, created on the first call; safe when several threads race on one slot.
/// The timers are never freed.
RKM_EXPORT RKMPolyLittleTimer *RKMGetPolyLittleTimer(void *&slot);
