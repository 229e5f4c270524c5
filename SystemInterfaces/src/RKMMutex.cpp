#include "RKMMutex.h"

RKMMutex::RKMMutex(int, int, int) {}

HRESULT RKMMutex::Lock()
{
  m_mutex.lock();
  return S_OK;
}

HRESULT RKMMutex::Unlock()
{
  m_mutex.unlock();
  return S_OK;
}

const RKMMutex::LockFunction RKMMutex::LockF = &RKMMutex::Lock;
const RKMMutex::LockFunction RKMMutex::UnlockF = &RKMMutex::Unlock;
