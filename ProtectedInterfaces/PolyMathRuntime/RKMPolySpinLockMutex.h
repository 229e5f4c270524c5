#pragma once

#include "RKMExport.h"

/// A busy-waiting lock in one int (0 free, 1 held), for very short critical sections; not reentrant.
class RKM_EXPORT RKMPolySpinLockMutex
{
public:
  RKMPolySpinLockMutex() = default;
  RKMPolySpinLockMutex(const RKMPolySpinLockMutex &) = delete;
  RKMPolySpinLockMutex &operator=(const RKMPolySpinLockMutex &) = delete;

  void Lock();
  void Unlock();

private:
  int m_lock = 0;
};
