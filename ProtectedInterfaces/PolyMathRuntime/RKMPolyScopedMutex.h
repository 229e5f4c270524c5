#pragma once

#include "RKMExport.h"

class RKMMutex;
class RKMPolySpinLockMutex;

/// Holds a mutex or a spin lock for the lifetime of the object.
class RKM_EXPORT RKMPolyScopedMutex
{
public:
  explicit RKMPolyScopedMutex(RKMMutex &mutex);
  explicit RKMPolyScopedMutex(RKMPolySpinLockMutex &spinLock);
  RKMPolyScopedMutex(const RKMPolyScopedMutex &) = delete;
  RKMPolyScopedMutex &operator=(const RKMPolyScopedMutex &) = delete;
  ~RKMPolyScopedMutex();

private:
  RKMMutex *m_mutex;
  RKMPolySpinLockMutex *m_spinLock;
};
