#pragma once

#include "RKMHTableCore.h"

/// Conversion of typed keys and values to and from the tables' words.
template <class T>
struct RKMWordCast;

template <>
struct RKMWordCast<int>
{
  static RKMWord To(int v) { return RKMWordOfInt(v); }
  static int From(RKMWord w) { return RKMIntOfWord(w); }
};

template <class P>
struct RKMWordCast<P *>
{
  static RKMWord To(P *p) { return reinterpret_cast<RKMWord>(p); }
  static P *From(RKMWord w) { return reinterpret_cast<P *>(w); }
};

/// The hash of an int key: the value itself.
inline unsigned int RKMHashIntWord(RKMWord w) { return static_cast<unsigned int>(RKMIntOfWord(w)); }
/// The hash of a pair of int keys: their sum, modulo 2^32.
inline unsigned int RKMHashIntSum(RKMWord a, RKMWord b) { return RKMHashIntWord(a) + RKMHashIntWord(b); }
inline unsigned int RKMHashWordSum(RKMWord a, RKMWord b) { return RKMDefaultWordHash(a) + RKMDefaultWordHash(b); }

/// Set of typed elements over the dense chained table; no allocation up to 31 elements.
template <class E, class Traits>
class RKMTypedSet
{
  typedef RKMHTableDetail::Core<RKMHTableDetail::EntryD, Traits> Core;

public:
  explicit RKMTypedSet(int size = 0, const Traits &traits = Traits()) : m_core(size, traits) {}

  /// S_OK when added, S_FALSE when an equal element is present, E_OUTOFMEMORY.
  HRESULT Insert(E e)
  {
    RKMHTableDetail::EntryD *entry;
    return m_core.Insert(RKMWordCast<E>::To(e), entry);
  }
  /// True when an equal element is present.
  unsigned char Locate(E e) const { return m_core.Find(RKMWordCast<E>::To(e)) != nullptr; }
  /// The stored element equal to e, or a zero element when absent.
  E Find(E e) const
  {
    const RKMHTableDetail::EntryD *entry = m_core.Find(RKMWordCast<E>::To(e));
    return RKMWordCast<E>::From(entry ? entry->data : 0);
  }
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(E e) { return m_core.Remove(RKMWordCast<E>::To(e), nullptr); }
  void RemoveAll() { m_core.RemoveAll(); }
  int Size() const { return m_core.Size(); }
  /// The bucket count; 0 when an allocation failed (the set then holds nothing and refuses insertions).
  int Capacity() const { return m_core.Capacity(); }
  unsigned char IsValid() const { return m_core.Capacity() != 0; }
  std::size_t SizeOf() const { return m_core.SizeOf(); }

  /// Walks the elements in entry order, as they stand when it is built.
  class Iterator : public RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryD>
  {
  public:
    explicit Iterator(const RKMTypedSet &s) : RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryD>(s.m_core) {}
    E operator*() const { return GetData(); }
    E GetData() const { return RKMWordCast<E>::From(this->Current()->data); }
  };

private:
  Core m_core;
};

/// Map of typed keys to typed values over the dense chained table; no allocation up to 31 entries.
template <class K, class V, class Traits>
class RKMTypedMap
{
  typedef RKMHTableDetail::Core<RKMHTableDetail::EntryK, Traits> Core;

public:
  explicit RKMTypedMap(int size = 0, const Traits &traits = Traits()) : m_core(size, traits) {}

  /// S_OK when added; S_FALSE when the key maps to this value already, E_FAIL when it maps to another
  /// (kept); E_OUTOFMEMORY.
  HRESULT Insert(K key, V value)
  {
    RKMHTableDetail::EntryK *e;
    return m_core.InsertData(RKMWordCast<K>::To(key), RKMWordCast<V>::To(value), e);
  }
  /// S_FALSE when the key maps to this value already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(K key, V value)
  {
    return m_core.InsertOrUpdate(RKMWordCast<K>::To(key), RKMWordCast<V>::To(value));
  }
  /// S_OK when the key was present and its value replaced, S_FALSE when absent.
  HRESULT Update(K key, V value) { return m_core.Update(RKMWordCast<K>::To(key), RKMWordCast<V>::To(value)); }
  /// True and the value when the key is present; value untouched otherwise.
  unsigned char Locate(K key, V &value) const
  {
    const RKMHTableDetail::EntryK *e = m_core.Find(RKMWordCast<K>::To(key));
    if (!e)
      return 0;
    value = RKMWordCast<V>::From(e->data);
    return 1;
  }
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(K key) { return m_core.Remove(RKMWordCast<K>::To(key), nullptr); }
  /// As Remove, giving the removed value.
  HRESULT Remove(K key, V &value)
  {
    RKMWord w = 0;
    const HRESULT hr = m_core.Remove(RKMWordCast<K>::To(key), &w);
    if (hr == S_OK)
      value = RKMWordCast<V>::From(w);
    return hr;
  }
  void RemoveAll() { m_core.RemoveAll(); }
  int Size() const { return m_core.Size(); }
  /// The bucket count; 0 when an allocation failed (the map then holds nothing and refuses insertions).
  int Capacity() const { return m_core.Capacity(); }
  unsigned char IsValid() const { return m_core.Capacity() != 0; }
  std::size_t SizeOf() const { return m_core.SizeOf(); }

  /// Walks the entries in entry order, as they stand when it is built.
  class Iterator : public RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryK>
  {
  public:
    explicit Iterator(const RKMTypedMap &m) : RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryK>(m.m_core) {}
    K GetKey() const { return RKMWordCast<K>::From(this->Current()->key); }
    V GetData() const { return RKMWordCast<V>::From(this->Current()->data); }
  };

private:
  Core m_core;
};

/// Map of typed key pairs to typed values over the dense chained table; no allocation up to 31 entries.
template <class K, class V, class Traits>
class RKMTypedMap2
{
  typedef RKMHTableDetail::Core<RKMHTableDetail::EntryKK, Traits> Core;
  static RKMHTableDetail::Keys2 Keys(K k1, K k2) { return {RKMWordCast<K>::To(k1), RKMWordCast<K>::To(k2)}; }

public:
  explicit RKMTypedMap2(int size = 0, const Traits &traits = Traits()) : m_core(size, traits) {}

  /// S_OK when added; S_FALSE when the keys map to this value already, E_FAIL when they map to another
  /// (kept); E_OUTOFMEMORY.
  HRESULT Insert(K k1, K k2, V value)
  {
    RKMHTableDetail::EntryKK *e;
    return m_core.InsertData(Keys(k1, k2), RKMWordCast<V>::To(value), e);
  }
  /// S_FALSE when the keys map to this value already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(K k1, K k2, V value) { return m_core.InsertOrUpdate(Keys(k1, k2), RKMWordCast<V>::To(value)); }
  /// S_OK when the keys were present and their value replaced, S_FALSE when absent.
  HRESULT Update(K k1, K k2, V value) { return m_core.Update(Keys(k1, k2), RKMWordCast<V>::To(value)); }
  /// True and the value when the keys are present; value untouched otherwise.
  unsigned char Locate(K k1, K k2, V &value) const
  {
    const RKMHTableDetail::EntryKK *e = m_core.Find(Keys(k1, k2));
    if (!e)
      return 0;
    value = RKMWordCast<V>::From(e->data);
    return 1;
  }
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(K k1, K k2) { return m_core.Remove(Keys(k1, k2), nullptr); }
  void RemoveAll() { m_core.RemoveAll(); }
  int Size() const { return m_core.Size(); }
  /// The bucket count; 0 when an allocation failed (the map then holds nothing and refuses insertions).
  int Capacity() const { return m_core.Capacity(); }
  unsigned char IsValid() const { return m_core.Capacity() != 0; }
  std::size_t SizeOf() const { return m_core.SizeOf(); }

  /// Walks the entries in entry order, as they stand when it is built.
  class Iterator : public RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryKK>
  {
  public:
    explicit Iterator(const RKMTypedMap2 &m) : RKMHTableDetail::TypedIter<Iterator, RKMHTableDetail::EntryKK>(m.m_core) {}
    K GetKey1() const { return RKMWordCast<K>::From(this->Current()->key1); }
    K GetKey2() const { return RKMWordCast<K>::From(this->Current()->key2); }
    V GetData() const { return RKMWordCast<V>::From(this->Current()->data); }
  };

private:
  Core m_core;
};
