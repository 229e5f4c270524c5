#pragma once

#include "CountedMutex.h"
#include "RKMExport.h"
#include "RKMHTableTyped.h"
#include "RKMMutex.h"
#include "RKMSysTypes.h"

#include <vector>

/// Mutual exclusion per address without a mutex per object: 16 inline mutexes serve the addresses
/// locked at a time, an overflow table the rest. Lock and Unlock of one address pair up; a thread may
/// lock an address it holds again (and unlocks it as often).
class RKM_EXPORT RKMPolySetOfMutex
{
public:
  RKMPolySetOfMutex();
  RKMPolySetOfMutex(const RKMPolySetOfMutex &) = delete;
  RKMPolySetOfMutex &operator=(const RKMPolySetOfMutex &) = delete;
  ~RKMPolySetOfMutex();

  /// Blocks until this thread holds the address. S_OK; S_FALSE for null (nothing locked); E_OUTOFMEMORY
  /// when no mutex can be had for it (nothing locked).
  HRESULT Lock(const void *address);
  /// S_OK; S_FALSE for null. Unlocking an address that is not locked prints "GroBe Katastrof!" on
  /// standard output, changes nothing and gives E_FAIL.
  HRESULT Unlock(const void *address);

private:
  static constexpr int kSlots = 16;
  typedef RKMTypedMap<const void *, CountedMutex *, RKMHTableDetail::FixedK<&RKMDefaultWordHash>> Overflow;

  RKMMutex m_guard;
  CountedMutex m_slots[kSlots];
  Overflow m_overflow;
  /// Mutexes given back by the overflow table, reused last in first out: the list never holds more
  /// than the most addresses that were in the overflow table at once.
  std::vector<CountedMutex *> m_recycled;
  int m_freeSlots = kSlots;
};
