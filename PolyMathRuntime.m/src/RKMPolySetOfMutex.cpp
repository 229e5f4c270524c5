#include "RKMPolyScopedMutex.h"
#include "RKMPolySetOfMutex.h"

#include <cstdio>
#include <new>

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
  CountedMutex *chosen = nullptr;
  {
    RKMPolyScopedMutex guard(m_guard);
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
    // The overflow table can hold the address even while slots are free: it was placed there while
    // the slots were full, and must keep its mutex for as long as a thread holds or waits for it.
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
      // Without a registered mutex a second thread could lock the same address through another
      // one: refuse rather than lock.
      if (!chosen || FAILED(m_overflow.Insert(address, chosen)))
      {
        if (chosen)
          Recycle(m_recycled, chosen);
        return E_OUTOFMEMORY;
      }
    }
    chosen->AddRef(address);
  }
  // Taken once the guard is let go: a thread waiting here must not keep the others from the set.
  (chosen->m_mutex.*RKMMutex::LockF)();
  return S_OK;
}

HRESULT RKMPolySetOfMutex::Unlock(const void *address)
{
  if (!address)
    return S_FALSE;
  RKMMutex *slotMutex = nullptr;
  {
    RKMPolyScopedMutex guard(m_guard);
    for (int i = 0; i < kSlots && !slotMutex; ++i)
    {
      CountedMutex &slot = m_slots[i];
      if (slot.m_key != address)
        continue;
      slot.RemRef();
      if (!slot.m_key)
        ++m_freeSlots;
      slotMutex = &slot.m_mutex;
    }
    if (!slotMutex)
    {
      CountedMutex *entry = nullptr;
      if (!m_overflow.Locate(address, entry) || !entry)
      {
        std::fputs("GroBe Katastrof!\n", stdout);
        return E_FAIL;
      }
      // Let go under the guard: once its count falls to 0 the mutex may be recycled or freed.
      (entry->m_mutex.*RKMMutex::UnlockF)();
      if (entry->RemRef() == 0)
      {
        m_overflow.Remove(address);
        Recycle(m_recycled, entry);
      }
      return S_OK;
    }
  }
  // An inline slot's mutex lives as long as the set, so it can be let go after the guard.
  (slotMutex->*RKMMutex::UnlockF)();
  return S_OK;
}
