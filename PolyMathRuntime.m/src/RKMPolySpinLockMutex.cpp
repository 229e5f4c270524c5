#include "RKMPolySpinLockMutex.h"

#include "RKMInterlocked.h"

#if defined(__x86_64__) || defined(__i386__)
#include <immintrin.h>
#endif

void RKMPolySpinLockMutex::Lock()
{
  while (RKMInterlockedCompareExchange(&m_lock, 1, 0) == 1)
  {
#if defined(__x86_64__) || defined(__i386__)
    _mm_pause();
#endif
  }
}

void RKMPolySpinLockMutex::Unlock() { RKMInterlockedCompareExchange(&m_lock, 0, 1); }
