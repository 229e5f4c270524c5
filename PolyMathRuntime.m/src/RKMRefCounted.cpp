#include "RKMPolyAtomicOperations.h"
#include "RKMRefCounted.h"

#include "RKMInterlocked.h"

RKMRefCounted::~RKMRefCounted() = default;

int RKMRefCounted::AddRef() { return RKMInterlockedIncrement(&m_refCount); }

int RKMRefCounted::Release()
{
  const int count = RKMInterlockedDecrement(&m_refCount);
  if (count == 0)
    delete this;
  return count;
}

int RKMRefCounted::GetRefCount() const { return RKMInterlockedRead(&m_refCount); }

int RKMPolyAtomicOperations::Increment(int *p) { return RKMInterlockedIncrement(p); }

int RKMPolyAtomicOperations::Decrement(int *p) { return RKMInterlockedDecrement(p); }

int RKMPolyAtomicOperations::CompareAndSwap(int *target, int exchange, int comparand)
{
  return RKMInterlockedCompareExchange(target, exchange, comparand);
}

int RKMPolyAtomicOperations::BitWiseOr(int *p, int bits)
{
  int before = RKMInterlockedCompareExchange(p, 0, 0);
  for (;;)
  {
    const int seen = RKMInterlockedCompareExchange(p, before | bits, before);
    if (seen == before)
      return before;
    before = seen;
  }
}

int RKMPolyAtomicOperations::BitWiseTestAndReset(int *p, int bits)
{
  int before = RKMInterlockedCompareExchange(p, 0, 0);
  for (;;)
  {
    const int seen = RKMInterlockedCompareExchange(p, before & ~bits, before);
    if (seen == before)
      return before;
    before = seen;
  }
}
