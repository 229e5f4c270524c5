#pragma once

#include "RKMCompareElements.h"
#include "RKMExport.h"
#include "RKMHTableCore.h"

/// Set of data words (elements). With a comparison object, elements are hashed and compared through
/// it; otherwise by the hash function (default: the word shifted right by 2) and by value.
/// No allocation up to 31 elements. A handle (the address of an entry) stays valid until the next
/// insertion that grows the table or the next removal.
class RKMHTable_D
{
  typedef RKMHTableDetail::Core<RKMHTableDetail::EntryD, RKMHTableDetail::GenericD> Core;

public:
  /// A size below 32 uses the inline storage. The comparison object is not owned and must outlive the table.
  explicit RKMHTable_D(int size = 0, const RKMCompareElements *cmp = nullptr, RKMHashFunction hash = nullptr)
      : m_core(size, RKMHTableDetail::GenericD{cmp, hash})
  {
  }

  /// S_OK and the new entry's handle when added; S_FALSE and the present entry's handle when an equal
  /// element is stored; E_OUTOFMEMORY and null.
  HRESULT Insert(RKMWord element, RKMWord *&handle)
  {
    RKMHTableDetail::EntryD *e;
    const HRESULT hr = m_core.Insert(element, e);
    handle = reinterpret_cast<RKMWord *>(e);
    return hr;
  }
  HRESULT Insert(RKMWord element)
  {
    RKMWord *h;
    return Insert(element, h);
  }
  /// The handle of the equal element, or null.
  RKMWord *Find(RKMWord element) const { return reinterpret_cast<RKMWord *>(m_core.Find(element)); }
  /// The handle of the first element of the bucket of hash whose own hash is exactly hash, or null.
  RKMWord *FindOne(unsigned int hash) const
  {
    for (RKMHTableDetail::EntryD *e = m_core.HeadOfBucket(hash); e; e = e->next)
      if (m_core.GetTraits().Hash(e->data) == hash)
        return reinterpret_cast<RKMWord *>(e);
    return nullptr;
  }
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(RKMWord element) { return m_core.Remove(element, nullptr); }
  void RemoveAll() { m_core.RemoveAll(); }
  int Size() const { return m_core.Size(); }
  /// The bucket count; 0 when an allocation failed (the table then holds nothing and refuses insertions).
  int Capacity() const { return m_core.Capacity(); }
  std::size_t SizeOf() const { return m_core.SizeOf(); }
  /// The element behind a handle.
  static RKMWord GetData(const RKMWord *handle) { return handle[0]; }

  /// Walks the elements in entry order, as they stand when it is built.
  class Iterator : public RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryD>
  {
  public:
    explicit Iterator(const RKMHTable_D &t) : TypedIter(t.m_core) {}
    RKMWord operator*() const { return Current()->data; }
    RKMWord GetData() const { return Current()->data; }
    RKMWord *GetHandle() const { return reinterpret_cast<RKMWord *>(Current()); }
  };

private:
  Core m_core;
};
