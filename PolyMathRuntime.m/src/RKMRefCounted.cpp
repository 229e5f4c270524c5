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
