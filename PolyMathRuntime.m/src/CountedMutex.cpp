#include "CountedMutex.h"

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
