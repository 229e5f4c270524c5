#pragma once

#include "RKMExport.h"

/// Base of shared objects: an intrusive, thread-safe reference count. The creator holds the first
/// reference; the last Release deletes the object. A copy is a new object with its own count of 1;
/// assignment leaves the target's count alone.
class RKM_EXPORT RKMRefCounted
{
public:
  /// Gives the new count.
  int AddRef();
  /// Gives the new count; at 0 the object has deleted itself and must not be touched again.
  int Release();
  /// The count as it stands (another thread may change it at once).
  int GetRefCount() const;

protected:
  RKMRefCounted() : m_refCount(1) {}
  RKMRefCounted(const RKMRefCounted &) : m_refCount(1) {}
  RKMRefCounted &operator=(const RKMRefCounted &) { return *this; }
  virtual ~RKMRefCounted();

private:
  int m_refCount;
};
