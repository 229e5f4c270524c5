#include "RKMPolyAtomicOperations.h"

#include "RKMInterlocked.h"

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
