#pragma once

#include "RKMRefCounted.h"
#include "RKMSysTypes.h"

#include <vector>

/// A link of a doubly linked chain of observers of type T (T derives from RKMPolyObserver<T>). The
/// owner of a chain holds one reference on its first element and every element one on its successor.
/// Links cannot be copied: a copy would hold the same successor twice.
template <class T>
class RKMPolyObserver : public RKMRefCounted
{
public:
  RKMPolyObserver(const RKMPolyObserver &) = delete;
  RKMPolyObserver &operator=(const RKMPolyObserver &) = delete;

  /// Appends the observer (one more reference) at the end of the chain whose head is in slot.
  /// E_INVALIDARG for null or an observer already in the chain.
  static HRESULT Register(T *&slot, T *observer)
  {
    if (!observer)
      return E_INVALIDARG;
    if (!slot)
    {
      observer->AddRef();
      slot = observer;
      return S_OK;
    }
    if (slot->IsAlreadyRegistered(observer))
      return E_INVALIDARG;
    T *last = slot;
    while (last->m_next)
      last = last->m_next;
    observer->AddRef();
    last->m_next = observer;
    observer->m_prev = last;
    return S_OK;
  }

  /// Removes the observer wherever it stands in the chain from slot on, relinking its neighbours and
  /// releasing the chain's reference to it (its successors keep theirs). Nothing for null or absent.
  static void Unregister(T *&slot, T *observer)
  {
    if (!observer || !slot)
      return;
    if (slot != observer)
    {
      Unregister(slot->m_next, observer);
      return;
    }
    T *next = observer->m_next;
    T *prev = observer->m_prev;
    if (next)
      next->m_prev = prev;
    slot = next;
    observer->m_next = nullptr;
    observer->m_prev = nullptr;
    observer->Release();
  }

  /// Copies the chain from head into copy, taking one reference on each observer, so that every one of
  /// them stays alive while it is notified even if the chain changes meanwhile (the caller holds the
  /// chain's lock during the copy, not during the notification). Memory shortage shortens the copy.
  static void Snapshot(T *head, std::vector<T *> &copy)
  {
    try
    {
      for (T *o = head; o; o = o->m_next)
        copy.push_back(o);
    }
    catch (...)
    {
    }
    for (T *o : copy)
      o->AddRef();
  }

  /// Releases the references Snapshot took.
  static void ReleaseSnapshot(std::vector<T *> &copy)
  {
    for (T *o : copy)
      o->Release();
    copy.clear();
  }

  /// Empties the chain from head: each observer is unlinked before the chain's reference to it is
  /// dropped, so that one still held elsewhere keeps no link to, or reference on, the others.
  static void ReleaseChain(T *&head)
  {
    T *o = head;
    head = nullptr;
    while (o)
    {
      T *next = o->m_next;
      o->m_next = nullptr;
      o->m_prev = nullptr;
      if (next)
        next->m_prev = nullptr;
      o->Release();
      o = next;
    }
  }

  /// True when o is this element or follows it in the chain.
  unsigned char IsAlreadyRegistered(const RKMPolyObserver<T> *o) const
  {
    for (const RKMPolyObserver<T> *e = this; e; e = e->m_next)
      if (e == o)
        return 1;
    return 0;
  }
  T *Next() const { return m_next; }
  T *Prev() const { return m_prev; }
  void SetNext(T *next) { m_next = next; }
  void SetPrev(T *prev) { m_prev = prev; }

protected:
  RKMPolyObserver() = default;
  /// Releases the successor, so that dropping the first element of an unlinked chain releases it all.
  ~RKMPolyObserver() override
  {
    m_prev = nullptr;
    T *next = m_next;
    m_next = nullptr;
    if (next)
      next->Release();
  }

private:
  T *m_prev = nullptr;
  T *m_next = nullptr;
};
