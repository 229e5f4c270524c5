#pragma once

#include "RKMCompareElements.h"
#include "RKMSysTypes.h"

#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <new>

/// Untyped data word of the hash tables: wide enough for a pointer or an int.
typedef std::uintptr_t RKMWord;

/// Hash of a word.
typedef unsigned int (*RKMHashFunction)(RKMWord);
/// Hash of a pair of words.
typedef unsigned int (*RKMHashFunction2)(RKMWord, RKMWord);
/// Equality of two key pairs (key1, key2 of one entry, then of the other): 0 when equal.
typedef int (*RKMCompareFunction4)(RKMWord, RKMWord, RKMWord, RKMWord);

/// The word holding an int key or value (sign-extended, so that GetKey gives the int back).
inline RKMWord RKMWordOfInt(int v) { return static_cast<RKMWord>(static_cast<std::intptr_t>(v)); }
inline int RKMIntOfWord(RKMWord w) { return static_cast<int>(static_cast<std::intptr_t>(w)); }

/// The default hash of a word: the word shifted right by 2. The bits above 34 are folded in, so
/// 64-bit pointers keep their spread; any word below 2^34 hashes as it did on 32 bits.
inline unsigned int RKMDefaultWordHash(RKMWord w)
{
  return static_cast<unsigned int>(w >> 2) ^ static_cast<unsigned int>(static_cast<std::uint64_t>(w) >> 34);
}

namespace RKMHTableDetail
{
constexpr int kInlineCapacity = 31;
/// The largest capacity a table grows to; beyond it growth reports E_OUTOFMEMORY.
constexpr std::size_t kMaxCapacity = std::size_t(1) << 30;

/// The smallest n ≥ request that no prime up to 19 divides, or 0 beyond kMaxCapacity.
inline std::size_t NextCapacity(std::size_t request)
{
  static const unsigned primes[] = {2, 3, 5, 7, 11, 13, 17, 19};
  for (std::size_t n = request < 21 ? 21 : request; n <= kMaxCapacity; ++n)
  {
    bool ok = true;
    for (unsigned p : primes)
      if (n % p == 0)
      {
        ok = false;
        break;
      }
    if (ok)
      return n;
  }
  return 0;
}

/// The capacity a table built for a requested size starts with (31 inline below 32).
inline std::size_t CapacityForRequest(long long request)
{
  return request < 32 ? std::size_t(kInlineCapacity) : NextCapacity(static_cast<std::size_t>(request));
}

struct EntryD
{
  RKMWord data;
  EntryD *next;
};
struct EntryK
{
  RKMWord key;
  RKMWord data;
  EntryK *next;
};
struct EntryKK
{
  RKMWord key1;
  RKMWord key2;
  RKMWord data;
  EntryKK *next;
};

/// Chained hash table over dense entries. Traits gives Key, Hash(key), Equal(entry, key), KeyOf(entry)
/// and SetKey(entry, key). The first 31 buckets and entries live inside the object; beyond that, one
/// heap block holds the bucket heads followed by the entries. Entries 0 … size−1 are always the ones
/// in use: a removal moves the last entry into the hole.
template <class Entry, class Traits>
class Core
{
public:
  typedef typename Traits::Key Key;

  explicit Core(long long size = 0, const Traits &traits = Traits()) : m_traits(traits) { Allocate(size); }

  Core(const Core &o) : m_traits(o.m_traits) { CopyFrom(o); }

  Core &operator=(const Core &o)
  {
    if (this == &o)
      return *this;
    Release();
    m_traits = o.m_traits;
    CopyFrom(o);
    return *this;
  }

  ~Core() { Release(); }

  int Size() const { return m_size; }
  /// The bucket count; 0 when an allocation of the table failed, and the table then refuses insertions.
  int Capacity() const { return static_cast<int>(m_capacity); }
  /// The object's own size, plus one bucket head per bucket when the buckets are on the heap.
  std::size_t SizeOf() const
  {
    return sizeof(*this) + (m_buckets && m_buckets != m_inlineBuckets ? m_capacity * sizeof(Entry *) : 0);
  }

  Entry *Entries() const { return m_nextFree - m_size; }

  Entry *Find(const Key &k) const
  {
    if (!m_capacity)
      return nullptr;
    for (Entry *e = m_buckets[Bucket(m_traits.Hash(k))]; e; e = e->next)
      if (m_traits.Equal(*e, k))
        return e;
    return nullptr;
  }

  /// S_OK with the new entry (its data left to the caller), S_FALSE with the equal entry present, or
  /// E_OUTOFMEMORY with null.
  HRESULT Insert(const Key &k, Entry *&out)
  {
    out = nullptr;
    if (!m_capacity)
      return E_OUTOFMEMORY;
    const unsigned h = m_traits.Hash(k);
    Entry **link = &m_buckets[Bucket(h)];
    for (; *link; link = &(*link)->next)
      if (m_traits.Equal(**link, k))
      {
        out = *link;
        return S_FALSE;
      }
    if (m_free == 0)
    {
      if (!Grow())
        return E_OUTOFMEMORY;
      for (link = &m_buckets[Bucket(h)]; *link; link = &(*link)->next)
      {
      }
    }
    Entry *e = m_nextFree++;
    Traits::SetKey(*e, k);
    e->next = nullptr;
    *link = e;
    ++m_size;
    --m_free;
    out = e;
    return S_OK;
  }

  /// S_OK with the removed entry's data, or S_FALSE when absent.
  HRESULT Remove(const Key &k, RKMWord *removedData)
  {
    if (!m_capacity || !m_size)
      return S_FALSE;
    Entry **link = &m_buckets[Bucket(m_traits.Hash(k))];
    while (*link && !m_traits.Equal(**link, k))
      link = &(*link)->next;
    Entry *hole = *link;
    if (!hole)
      return S_FALSE;
    if (removedData)
      *removedData = hole->data;
    *link = hole->next;
    --m_size;
    ++m_free;
    Entry *last = --m_nextFree;
    if (m_size == 0 || hole == last)
      return S_OK;
    Entry **toLast = &m_buckets[Bucket(m_traits.Hash(Traits::KeyOf(*last)))];
    while (*toLast != last)
      toLast = &(*toLast)->next;
    *toLast = hole;
    *hole = *last;
    return S_OK;
  }

  /// Insert that stores data in a new entry. S_OK when added; S_FALSE when the key holds this data
  /// already, E_FAIL when it holds other data (left unchanged); E_OUTOFMEMORY. out is the entry, or null.
  HRESULT InsertData(const Key &k, RKMWord data, Entry *&out)
  {
    const HRESULT hr = Insert(k, out);
    if (hr == S_OK)
      out->data = data;
    else if (hr == S_FALSE && out->data != data)
      return E_FAIL;
    return hr;
  }

  /// S_FALSE when the key holds this data already; otherwise stores it (adding the key) and gives S_OK.
  HRESULT InsertOrUpdate(const Key &k, RKMWord data)
  {
    Entry *e;
    const HRESULT hr = Insert(k, e);
    if (FAILED(hr))
      return hr;
    if (hr == S_FALSE && e->data == data)
      return S_FALSE;
    e->data = data;
    return S_OK;
  }

  /// S_OK when the key was present and its data replaced, S_FALSE when absent.
  HRESULT Update(const Key &k, RKMWord data)
  {
    Entry *e = Find(k);
    if (!e)
      return S_FALSE;
    e->data = data;
    return S_OK;
  }

  /// Empties the table and keeps its capacity.
  void RemoveAll()
  {
    if (!m_capacity)
      return;
    Entry *entries = Entries();
    std::memset(static_cast<void *>(m_buckets), 0, m_capacity * sizeof(Entry *));
    m_nextFree = entries;
    m_free = static_cast<int>(m_capacity);
    m_size = 0;
  }

  Entry *HeadOfBucket(unsigned hash) const { return m_capacity ? m_buckets[Bucket(hash)] : nullptr; }
  const Traits &GetTraits() const { return m_traits; }

protected:
  Traits m_traits;

private:
  // hash mod capacity without a division: with M = ⌊(2^64 − 1) / capacity⌋ + 1, the high 64 bits of
  // (M·hash mod 2^64)·capacity are hash mod capacity, exactly, for every 32-bit hash and capacity.
  unsigned Bucket(unsigned hash) const
  {
    const std::uint64_t low = m_modMultiplier * hash;
    return static_cast<unsigned>((static_cast<unsigned __int128>(low) * m_capacity) >> 64);
  }

  void SetCapacity(std::size_t capacity)
  {
    m_capacity = static_cast<unsigned>(capacity);
    m_modMultiplier = UINT64_MAX / capacity + 1;
  }

  void SetFailed()
  {
    m_capacity = 0;
    m_modMultiplier = 0;
    m_buckets = nullptr;
    m_nextFree = nullptr;
    m_free = 0;
    m_size = 0;
  }

  // Points the table at a zeroed block of the given capacity (inline for 31); false when memory runs out.
  bool Allocate(long long request)
  {
    const std::size_t capacity = CapacityForRequest(request);
    if (!capacity)
    {
      SetFailed();
      return false;
    }
    Entry **buckets = m_inlineBuckets;
    Entry *entries = m_inlineEntries;
    if (capacity > std::size_t(kInlineCapacity))
    {
      void *block = std::malloc(capacity * (sizeof(Entry *) + sizeof(Entry)));
      if (!block)
      {
        SetFailed();
        return false;
      }
      buckets = static_cast<Entry **>(block);
      entries = reinterpret_cast<Entry *>(buckets + capacity);
    }
    std::memset(static_cast<void *>(buckets), 0, capacity * sizeof(Entry *));
    SetCapacity(capacity);
    m_buckets = buckets;
    m_nextFree = entries;
    m_free = static_cast<int>(capacity);
    m_size = 0;
    return true;
  }

  void Release()
  {
    if (m_buckets && m_buckets != m_inlineBuckets)
      std::free(m_buckets);
    SetFailed();
  }

  // Copies entry by entry, in entry order, into a block of the source's capacity. A failed allocation
  // leaves the failed state, which holds nothing and refuses insertions.
  void CopyFrom(const Core &o)
  {
    if (!o.m_capacity)
    {
      SetFailed();
      return;
    }
    if (!Allocate(o.m_capacity))
      return;
    Relink(o.Entries(), o.m_size);
  }

  // Fills entries 0 … n−1 from src and chains them. Walking backwards and pushing at the heads keeps
  // every chain in entry order, as appending at the tails would.
  void Relink(const Entry *src, int n)
  {
    Entry *entries = m_nextFree;
    for (int i = n - 1; i >= 0; --i)
    {
      Entry *e = entries + i;
      *e = src[i];
      Entry **head = &m_buckets[Bucket(m_traits.Hash(Traits::KeyOf(*e)))];
      e->next = *head;
      *head = e;
    }
    m_nextFree = entries + n;
    m_size = n;
    m_free = static_cast<int>(m_capacity) - n;
  }

  bool Grow()
  {
    const std::size_t request = std::size_t(m_capacity) * 2 > 21 ? std::size_t(m_capacity) * 2 : 21;
    const std::size_t capacity = NextCapacity(request);
    if (!capacity)
      return false;
    void *block = std::malloc(capacity * (sizeof(Entry *) + sizeof(Entry)));
    if (!block)
      return false;
    Entry **oldBuckets = m_buckets;
    Entry *oldEntries = Entries();
    const int n = m_size;
    m_buckets = static_cast<Entry **>(block);
    SetCapacity(capacity);
    std::memset(static_cast<void *>(m_buckets), 0, capacity * sizeof(Entry *));
    m_nextFree = reinterpret_cast<Entry *>(m_buckets + capacity);
    Relink(oldEntries, n);
    if (oldBuckets != m_inlineBuckets)
      std::free(oldBuckets);
    return true;
  }

  unsigned m_capacity = 0;
  std::uint64_t m_modMultiplier = 0;
  Entry **m_buckets = nullptr;
  Entry *m_nextFree = nullptr;
  Entry *m_inlineBuckets[kInlineCapacity];
  Entry m_inlineEntries[kInlineCapacity];
  int m_free = 0;
  int m_size = 0;
};

/// Walks entries 0 … size−1 as they stand when it is built.
template <class Entry>
class Iter
{
public:
  template <class Table>
  explicit Iter(const Table &t) : m_entry(t.Entries()), m_end(t.Entries() + t.Size())
  {
  }
  unsigned char End() const { return m_entry == m_end; }
  void Next() { ++m_entry; }
  Entry *Current() const { return m_entry; }

private:
  Entry *m_entry;
  Entry *m_end;
};

/// The iterators of the tables and typed containers: Iter's walk with End and ++, to which each adds
/// the accessors of its entry kind.
template <class Derived, class Entry>
class TypedIter
{
public:
  template <class Table>
  explicit TypedIter(const Table &t) : m_it(t)
  {
  }
  unsigned char End() const { return m_it.End(); }
  Derived &operator++()
  {
    m_it.Next();
    return static_cast<Derived &>(*this);
  }

protected:
  Entry *Current() const { return m_it.Current(); }

private:
  Iter<Entry> m_it;
};

/// Elements hashed and compared through a comparison object when given, else by the hash function
/// (default: RKMDefaultWordHash) and by value.
struct GenericD
{
  typedef RKMWord Key;
  const RKMCompareElements *cmp = nullptr;
  RKMHashFunction hash = nullptr;
  unsigned Hash(RKMWord k) const
  {
    return cmp ? cmp->Hash(reinterpret_cast<const void *>(k)) : (hash ? hash(k) : RKMDefaultWordHash(k));
  }
  bool Equal(const EntryD &e, RKMWord k) const
  {
    return cmp ? cmp->Compare(reinterpret_cast<const void *>(e.data), reinterpret_cast<const void *>(k)) == 0
               : e.data == k;
  }
  static RKMWord KeyOf(const EntryD &e) { return e.data; }
  static void SetKey(EntryD &e, RKMWord k) { e.data = k; }
};

/// Keys hashed by the hash function (default: RKMDefaultWordHash), compared through the comparison
/// object when given, else by value.
struct GenericK
{
  typedef RKMWord Key;
  const RKMCompareElements *cmp = nullptr;
  RKMHashFunction hash = nullptr;
  unsigned Hash(RKMWord k) const { return hash ? hash(k) : RKMDefaultWordHash(k); }
  bool Equal(const EntryK &e, RKMWord k) const
  {
    return cmp ? cmp->Compare(reinterpret_cast<const void *>(e.key), reinterpret_cast<const void *>(k)) == 0
               : e.key == k;
  }
  static RKMWord KeyOf(const EntryK &e) { return e.key; }
  static void SetKey(EntryK &e, RKMWord k) { e.key = k; }
};

struct Keys2
{
  RKMWord k1, k2;
};

/// Key pairs hashed by the hash function (default: the sum of both words' default hashes) and compared
/// by the comparison function (default: both words equal).
struct GenericKK
{
  typedef Keys2 Key;
  RKMHashFunction2 hash = nullptr;
  RKMCompareFunction4 cmp = nullptr;
  unsigned Hash(const Keys2 &k) const
  {
    return hash ? hash(k.k1, k.k2) : RKMDefaultWordHash(k.k1) + RKMDefaultWordHash(k.k2);
  }
  bool Equal(const EntryKK &e, const Keys2 &k) const
  {
    return cmp ? cmp(e.key1, e.key2, k.k1, k.k2) == 0 : (e.key1 == k.k1 && e.key2 == k.k2);
  }
  static Keys2 KeyOf(const EntryKK &e) { return {e.key1, e.key2}; }
  static void SetKey(EntryKK &e, const Keys2 &k)
  {
    e.key1 = k.k1;
    e.key2 = k.k2;
  }
};

/// A fixed, inlined hash and equality by value, for the typed tables.
template <unsigned (*H)(RKMWord)>
struct FixedD
{
  typedef RKMWord Key;
  unsigned Hash(RKMWord k) const { return H(k); }
  bool Equal(const EntryD &e, RKMWord k) const { return e.data == k; }
  static RKMWord KeyOf(const EntryD &e) { return e.data; }
  static void SetKey(EntryD &e, RKMWord k) { e.data = k; }
};

template <unsigned (*H)(RKMWord)>
struct FixedK
{
  typedef RKMWord Key;
  unsigned Hash(RKMWord k) const { return H(k); }
  bool Equal(const EntryK &e, RKMWord k) const { return e.key == k; }
  static RKMWord KeyOf(const EntryK &e) { return e.key; }
  static void SetKey(EntryK &e, RKMWord k) { e.key = k; }
};

template <unsigned (*H)(RKMWord, RKMWord)>
struct FixedKK
{
  typedef Keys2 Key;
  unsigned Hash(const Keys2 &k) const { return H(k.k1, k.k2); }
  bool Equal(const EntryKK &e, const Keys2 &k) const { return e.key1 == k.k1 && e.key2 == k.k2; }
  static Keys2 KeyOf(const EntryKK &e) { return {e.key1, e.key2}; }
  static void SetKey(EntryKK &e, const Keys2 &k)
  {
    e.key1 = k.k1;
    e.key2 = k.k2;
  }
};
}
