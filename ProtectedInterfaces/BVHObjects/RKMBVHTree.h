#pragma once

#include "RKMExport.h"
#include "RKMPolyDebugObjectTrace.h"
#include "RKMPolySpinLockMutex.h"
#include "RKMRefCounted.h"
#include "RKMSysTypes.h"

class RKMBVHNode;
class RKMBVHNodeConst;
class RKMBVHTreeObserver;

/// The shared owner of one hierarchy: deletes it with the last Release, and tells its observers when
/// it is flushed or destroyed. Trees cannot be copied (a copy would own the same root).
class RKM_EXPORT RKMBVHTree : public RKMRefCounted
{
public:
  /// Takes ownership of root (null accepted). Reference count 1.
  explicit RKMBVHTree(RKMBVHNode *root);
  RKMBVHTree(const RKMBVHTree &) = delete;
  RKMBVHTree &operator=(const RKMBVHTree &) = delete;

  /// The root, or null.
  RKMBVHNodeConst *GetRoot();
  const RKMBVHNodeConst *GetRoot() const;
  /// Forgets the root without deleting it: the caller takes the hierarchy over.
  void UnregisterRootNode();
  /// Adds an observer (one more reference) unless null or already registered. Safe from any thread.
  void RegisterObserver(RKMBVHTreeObserver *observer);
  /// Removes an observer and releases the tree's reference to it. Safe from any thread, also from
  /// inside a notification.
  void UnregisterObserver(RKMBVHTreeObserver *observer);
  /// With a root: tells the observers, then flushes and collapses the hierarchy.
  void FlushMemory();
  /// E_NOTIMPL.
  HRESULT Absorb(RKMBVHTree &other);
  /// 0.
  unsigned SizeOf() const { return 0; }

protected:
  /// Tells the observers, releases them, then deletes the hierarchy.
  ~RKMBVHTree() override;

private:
  enum class Notice
  {
    Deletion,
    Flush
  };
  void Notify(Notice notice);

  RKMBVHNode *m_root;
  RKMPolySpinLockMutex m_observerLock;
  RKMBVHTreeObserver *m_observers = nullptr;
  RKMPolyDebugObjectTrace m_trace;
};
