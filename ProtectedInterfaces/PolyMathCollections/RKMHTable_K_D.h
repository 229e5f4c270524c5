#pragma once

#include "RKMCompareElements.h"
#include "RKMExport.h"
#include "RKMHTableCore.h"

/// Map of one key word to one data word. Keys are hashed by the hash function (default: the word
/// shifted right by 2) and compared through the comparison object when given, else by value.
/// No allocation up to 31 entries. A handle (the address of an entry) stays valid until the next
/// insertion that grows the table or the next removal.
class RKMHTable_K_D
{
  typedef RKMHTableDetail::Core<RKMHTableDetail::EntryK, RKMHTableDetail::GenericK> Core;

public:
  /// A size below 32 uses the inline storage. The comparison object is not owned and must outlive the table.
  explicit RKMHTable_K_D(int size = 0, const RKMCompareElements *cmp = nullptr, RKMHashFunction hash = nullptr)
      : m_core(size, RKMHTableDetail::GenericK{cmp, hash})
  {
  }

  /// S_OK when added; S_FALSE when the key holds this data already, E_FAIL when it holds other data
  /// (kept); E_OUTOFMEMORY.
  HRESULT Insert(RKMWord key, RKMWord data)
  {
    RKMHTableDetail::EntryK *e;
    return m_core.InsertData(key, data, e);
  }
  /// As Insert; the handle is the new or present entry, null on E_OUTOFMEMORY.
  HRESULT Insert(RKMWord key, RKMWord data, RKMWord *&handle)
  {
    RKMHTableDetail::EntryK *e;
    const HRESULT hr = m_core.InsertData(key, data, e);
    handle = reinterpret_cast<RKMWord *>(e);
    return hr;
  }
  /// S_FALSE when the key holds this data already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(RKMWord key, RKMWord data) { return m_core.InsertOrUpdate(key, data); }
  /// S_OK when the key was present and its data replaced, S_FALSE when absent.
  HRESULT Update(RKMWord key, RKMWord data) { return m_core.Update(key, data); }
  static void Update(RKMWord *handle, RKMWord data) { handle[1] = data; }
  /// The handle of the key's entry, or null.
  RKMWord *Find(RKMWord key) const { return reinterpret_cast<RKMWord *>(m_core.Find(key)); }
  /// True and the data when the key is present.
  unsigned char Locate(RKMWord key, RKMWord &data) const
  {
    const RKMHTableDetail::EntryK *e = m_core.Find(key);
    if (!e)
      return 0;
    data = e->data;
    return 1;
  }
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(RKMWord key) { return m_core.Remove(key, nullptr); }
  /// As Remove, giving the removed data.
  HRESULT Remove(RKMWord key, RKMWord &data) { return m_core.Remove(key, &data); }
  void RemoveAll() { m_core.RemoveAll(); }
  int Size() const { return m_core.Size(); }
  /// The bucket count; 0 when an allocation failed (the table then holds nothing and refuses insertions).
  int Capacity() const { return m_core.Capacity(); }
  std::size_t SizeOf() const { return m_core.SizeOf(); }
  static RKMWord GetKey(const RKMWord *handle) { return handle[0]; }
  static RKMWord GetData(const RKMWord *handle) { return handle[1]; }

  /// Walks the entries in entry order, as they stand when it is built.
  class Iterator : public RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryK>
  {
  public:
    explicit Iterator(const RKMHTable_K_D &t) : TypedIter(t.m_core) {}
    RKMWord GetKey() const { return Current()->key; }
    RKMWord GetData() const { return Current()->data; }
    RKMWord *GetHandle() const { return reinterpret_cast<RKMWord *>(Current()); }
  };

private:
  Core m_core;
};
