#include "RKMPolyScopedMutex.h"
#include "RKMPolySpinLockMutex.h"

#include "RKMMutex.h"

RKMPolyScopedMutex::RKMPolyScopedMutex(RKMMutex &mutex) : m_mutex(&mutex), m_spinLock(nullptr)
{
  (m_mutex->*RKMMutex::LockF)();
}

RKMPolyScopedMutex::RKMPolyScopedMutex(RKMPolySpinLockMutex &spinLock) : m_mutex(nullptr), m_spinLock(&spinLock)
{
  m_spinLock->Lock();
}

RKMPolyScopedMutex::~RKMPolyScopedMutex()
{
  if (m_mutex)
    (m_mutex->*RKMMutex::UnlockF)();
  else
    m_spinLock->Unlock();
}
