#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <mutex>

/// Recursive mutex: the thread that holds it may lock it again and must unlock as often.
class RKM_EXPORT RKMMutex
{
public:
  /// The flags are accepted for compatibility; every mutex is recursive.
  explicit RKMMutex(int flag1 = 0, int flag2 = 0, int flag3 = 0);
  RKMMutex(const RKMMutex &) = delete;
  RKMMutex &operator=(const RKMMutex &) = delete;

  HRESULT Lock();
  HRESULT Unlock();

  typedef HRESULT (RKMMutex::*LockFunction)();
  /// The entries through which the library locks and unlocks: (mutex.*RKMMutex::LockF)().
  static const LockFunction LockF;
  static const LockFunction UnlockF;

private:
  std::recursive_mutex m_mutex;
};
