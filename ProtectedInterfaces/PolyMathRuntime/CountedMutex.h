#pragma once

#include "RKMExport.h"
#include "RKMMutex.h"

/// A mutex standing for one address at a time, with the number of threads that hold or wait for it.
/// Its fields are read and written under the guard of the owning RKMPolySetOfMutex.
class RKM_EXPORT CountedMutex
{
public:
  CountedMutex() : m_mutex(0, 1, 0) {}

  /// count += 1; the mutex now stands for key.
  void AddRef(const void *key);
  /// count −= 1, freeing the key when no thread is left; gives the new count.
  int RemRef();

  RKMMutex m_mutex;
  const void *m_key = nullptr;
  int m_count = 0;
};
