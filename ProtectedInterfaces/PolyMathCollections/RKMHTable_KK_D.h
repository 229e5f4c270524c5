#pragma once

#include "RKMExport.h"
#include "RKMHTableCore.h"

/// Map of two key words to one data word. Keys are hashed by the hash function (default: the sum of
/// both words each shifted right by 2) and compared by the comparison function (default: both words
/// equal). No allocation up to 31 entries. A handle stays
/// valid until the next insertion that grows the table or the next removal.
class RKMHTable_KK_D
{
  typedef RKMHTableDetail::Core<RKMHTableDetail::EntryKK, RKMHTableDetail::GenericKK> Core;

public:
  /// A size below 32 uses the inline storage.
  explicit RKMHTable_KK_D(int size = 0, RKMHashFunction2 hash = nullptr, RKMCompareFunction4 cmp = nullptr)
      : m_core(size, RKMHTableDetail::GenericKK{hash, cmp})
  {
  }

  /// S_OK when added; S_FALSE when the keys hold this data already, E_FAIL when they hold other data
  /// (kept); E_OUTOFMEMORY.
  HRESULT Insert(RKMWord k1, RKMWord k2, RKMWord data)
  {
    RKMHTableDetail::EntryKK *e;
    return m_core.InsertData({k1, k2}, data, e);
  }
  /// As Insert; the handle is the new or present entry, null on E_OUTOFMEMORY.
  HRESULT Insert(RKMWord k1, RKMWord k2, RKMWord data, RKMWord *&handle)
  {
    RKMHTableDetail::EntryKK *e;
    const HRESULT hr = m_core.InsertData({k1, k2}, data, e);
    handle = reinterpret_cast<RKMWord *>(e);
    return hr;
  }
  /// S_FALSE when the keys hold this data already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(RKMWord k1, RKMWord k2, RKMWord data) { return m_core.InsertOrUpdate({k1, k2}, data); }
  /// S_OK when the keys were present and their data replaced, S_FALSE when absent.
  HRESULT Update(RKMWord k1, RKMWord k2, RKMWord data) { return m_core.Update({k1, k2}, data); }
  static void Update(RKMWord *handle, RKMWord data) { handle[2] = data; }
  RKMWord *Find(RKMWord k1, RKMWord k2) const { return reinterpret_cast<RKMWord *>(m_core.Find({k1, k2})); }
  /// True and the data when the keys are present.
  unsigned char Locate(RKMWord k1, RKMWord k2, RKMWord &data) const
  {
    const RKMHTableDetail::EntryKK *e = m_core.Find({k1, k2});
    if (!e)
      return 0;
    data = e->data;
    return 1;
  }
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(RKMWord k1, RKMWord k2) { return m_core.Remove({k1, k2}, nullptr); }
  HRESULT Remove(RKMWord k1, RKMWord k2, RKMWord &data) { return m_core.Remove({k1, k2}, &data); }
  void RemoveAll() { m_core.RemoveAll(); }
  int Size() const { return m_core.Size(); }
  /// The bucket count; 0 when an allocation failed (the table then holds nothing and refuses insertions).
  int Capacity() const { return m_core.Capacity(); }
  std::size_t SizeOf() const { return m_core.SizeOf(); }
  static RKMWord GetKey1(const RKMWord *handle) { return handle[0]; }
  static RKMWord GetKey2(const RKMWord *handle) { return handle[1]; }
  static RKMWord GetData(const RKMWord *handle) { return handle[2]; }

  /// Walks the entries in entry order, as they stand when it is built.
  class Iterator : public RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryKK>
  {
  public:
    explicit Iterator(const RKMHTable_KK_D &t) : TypedIter(t.m_core) {}
    RKMWord GetKey1() const { return Current()->key1; }
    RKMWord GetKey2() const { return Current()->key2; }
    RKMWord GetData() const { return Current()->data; }
    RKMWord *GetHandle() const { return reinterpret_cast<RKMWord *>(Current()); }
  };

private:
  Core m_core;
};
