#pragma once

#include "RKMHTableTyped.h"

#include <type_traits>

/// Map keyed by coordinate triples. The key is interned first: inserted into (or found in) the set,
/// whose stored triple's address is then the key of the map that holds the value. Set is the interning
/// set (it keeps the caller's triples, or copies them into a pool).
template <class Set, class T, class V>
class RKMInternedTripleMap
{
  typedef RKMTypedMap<const T *, V, RKMHTableDetail::FixedK<&RKMDefaultWordHash>> Values;

public:
  explicit RKMInternedTripleMap(int size = 0) : m_set(size), m_values(size) {}
  /// A copy holds the same triples and values; when memory runs out it holds none and IsValid is false.
  RKMInternedTripleMap(const RKMInternedTripleMap &other) : m_set(other.Size()), m_values(other.Size())
  {
    CopyFrom(other);
  }
  RKMInternedTripleMap &operator=(const RKMInternedTripleMap &other)
  {
    if (this != &other)
    {
      RemoveAll();
      m_valid = true;
      CopyFrom(other);
    }
    return *this;
  }

  /// S_OK when added; S_FALSE when the triple maps to this value already, E_FAIL when it maps to
  /// another (kept); E_INVALIDARG for null; E_OUTOFMEMORY, or E_FAIL when the pool is full. A triple
  /// interned for an insertion that then fails is taken out again.
  HRESULT Insert(const T *xyz, V value)
  {
    if (!xyz)
      return E_INVALIDARG;
    const HRESULT interned = m_set.Insert(xyz);
    if (FAILED(interned))
      return interned;
    const HRESULT hr = m_values.Insert(m_set.Find(xyz), value);
    if (FAILED(hr) && interned == S_OK)
      m_set.Remove(xyz);
    return hr;
  }
  /// S_FALSE when the triple maps to this value already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(const T *xyz, V value)
  {
    if (!xyz)
      return E_INVALIDARG;
    const HRESULT interned = m_set.Insert(xyz);
    if (FAILED(interned))
      return interned;
    const HRESULT hr = m_values.InsertOrUpdate(m_set.Find(xyz), value);
    if (FAILED(hr) && interned == S_OK)
      m_set.Remove(xyz);
    return hr;
  }
  /// True and the value when the triple is present; value untouched otherwise.
  unsigned char Locate(const T *xyz, V &value) const
  {
    const T *key = xyz ? m_set.Find(xyz) : nullptr;
    return key ? m_values.Locate(key, value) : 0;
  }
  /// Removes the value, then the interned triple. S_OK when removed, S_FALSE when absent.
  HRESULT Remove(const T *xyz)
  {
    const T *key = xyz ? m_set.Find(xyz) : nullptr;
    if (!key)
      return S_FALSE;
    m_values.Remove(key);
    m_set.Remove(xyz);
    return S_OK;
  }
  void RemoveAll()
  {
    m_values.RemoveAll();
    m_set.RemoveAll();
  }
  int Size() const { return m_values.Size(); }
  /// False when a construction or a copy ran out of memory; the map then holds nothing and refuses
  /// insertions.
  unsigned char IsValid() const { return m_valid && m_set.IsValid() && m_values.IsValid(); }

  /// Walks the entries in entry order, as they stand when it is built.
  class Iterator
  {
  public:
    explicit Iterator(const RKMInternedTripleMap &m) : m_it(m.m_values) {}
    unsigned char End() const { return m_it.End(); }
    Iterator &operator++()
    {
      ++m_it;
      return *this;
    }
    /// The stored triple.
    const T *GetTriple() const { return m_it.GetKey(); }
    template <class U = T, class = typename std::enable_if<std::is_same<U, double>::value>::type>
    const double *GetDoubles() const
    {
      return m_it.GetKey();
    }
    template <class U = T, class = typename std::enable_if<std::is_same<U, float>::value>::type>
    const float *GetFloats() const
    {
      return m_it.GetKey();
    }
    V GetData() const { return m_it.GetData(); }

  private:
    typename Values::Iterator m_it;
  };

private:
  void CopyFrom(const RKMInternedTripleMap &other)
  {
    if (!other.IsValid())
    {
      m_valid = false;
      return;
    }
    for (Iterator it(other); !it.End(); ++it)
      if (FAILED(Insert(it.GetTriple(), it.GetData())))
      {
        RemoveAll();
        m_valid = false;
        return;
      }
  }

  Set m_set;
  Values m_values;
  bool m_valid = true;
};
