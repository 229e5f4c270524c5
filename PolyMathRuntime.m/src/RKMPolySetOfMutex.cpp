#include "CountedMutex.h"
#include "RKMPolyScopedMutex.h"
#include "RKMPolySetOfMutex.h"
#include "RKMPolySpinLockMutex.h"

#include "RKMInterlocked.h"

#include <cstdio>
#include <new>

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

void CountedMutex::AddRef(const void *key)
{
  ++m_count;
  m_key = key;
}

int CountedMutex::RemRef()
{
  if (m_count < 2)
    m_key = nullptr;
  return --m_count;
}

namespace
{
// Keeps a freed mutex for reuse; when even that bookkeeping cannot get memory, the mutex is freed.
void Recycle(std::vector<CountedMutex *> &recycled, CountedMutex *m)
{
  try
  {
    recycled.push_back(m);
  }
  catch (...)
  {
    delete m;
  }
}
}

RKMPolySetOfMutex::RKMPolySetOfMutex() : m_guard(0, 1, 0) {}

RKMPolySetOfMutex::~RKMPolySetOfMutex()
{
  for (Overflow::Iterator it(m_overflow); !it.End(); ++it)
    delete it.GetData();
  for (CountedMutex *m : m_recycled)
    delete m;
}

HRESULT RKMPolySetOfMutex::Lock(const void *address)
{
  if (!address)
    return S_FALSE;
  (m_guard.*RKMMutex::LockF)();
  CountedMutex *chosen = nullptr;
  CountedMutex *firstFree = nullptr;
  int usedToSee = kSlots - m_freeSlots;
  for (int i = 0; i < kSlots && !chosen; ++i)
  {
    CountedMutex &slot = m_slots[i];
    if (slot.m_key == address)
      chosen = &slot;
    else if (slot.m_key)
      --usedToSee;
    else if (!firstFree)
      firstFree = &slot;
    // Every used slot has been seen and a free one is known: the address holds no slot.
    if (!chosen && usedToSee == 0 && firstFree)
      break;
  }
  // The overflow table can hold the address even while slots are free: it was placed there while the
  // slots were full, and must keep its mutex for as long as a thread holds or waits for it.
  if (!chosen && (m_freeSlots == 0 || m_overflow.Size() > 0))
    m_overflow.Locate(address, chosen);
  if (!chosen && firstFree)
  {
    chosen = firstFree;
    --m_freeSlots;
  }
  else if (!chosen)
  {
    if (!m_recycled.empty())
    {
      chosen = m_recycled.back();
      m_recycled.pop_back();
    }
    else
      chosen = new (std::nothrow) CountedMutex;
    // Without a registered mutex a second thread could lock the same address through another one:
    // refuse rather than lock.
    if (!chosen || FAILED(m_overflow.Insert(address, chosen)))
    {
      if (chosen)
        Recycle(m_recycled, chosen);
      (m_guard.*RKMMutex::UnlockF)();
      return E_OUTOFMEMORY;
    }
  }
  chosen->AddRef(address);
  (m_guard.*RKMMutex::UnlockF)();
  (chosen->m_mutex.*RKMMutex::LockF)();
  return S_OK;
}

HRESULT RKMPolySetOfMutex::Unlock(const void *address)
{
  if (!address)
    return S_FALSE;
  (m_guard.*RKMMutex::LockF)();
  for (int i = 0; i < kSlots; ++i)
  {
    CountedMutex &slot = m_slots[i];
    if (slot.m_key != address)
      continue;
    slot.RemRef();
    if (!slot.m_key)
      ++m_freeSlots;
    (m_guard.*RKMMutex::UnlockF)();
    (slot.m_mutex.*RKMMutex::UnlockF)();
    return S_OK;
  }
  CountedMutex *entry = nullptr;
  if (!m_overflow.Locate(address, entry) || !entry)
  {
    std::fputs("GroBe Katastrof!\n", stdout);
    (m_guard.*RKMMutex::UnlockF)();
    return E_FAIL;
  }
  (entry->m_mutex.*RKMMutex::UnlockF)();
  if (entry->RemRef() == 0)
  {
    m_overflow.Remove(address);
    Recycle(m_recycled, entry);
  }
  (m_guard.*RKMMutex::UnlockF)();
  return S_OK;
}
