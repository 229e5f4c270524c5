// The hash table and its iterator over one hash code's entries, both declared in RKMHashTable.h.

#include "RKMHashTable.h"

#include <cstdint>

namespace
{
unsigned AddressHash(const void *p)
{
  const std::uintptr_t w = reinterpret_cast<std::uintptr_t>(p);
  return static_cast<unsigned>(w >> 3) ^ static_cast<unsigned>(static_cast<std::uint64_t>(w) >> 35);
}
}

RKMHashTable::RKMHashTable(RKMHashTableHash hash, RKMHashTableCompare compare, int initialSize)
    : m_hash(hash), m_compare(compare)
{
  Rehash(initialSize > 16 ? static_cast<size_t>(initialSize) : 16);
}

RKMHashTable::RKMHashTable(const RKMHashTable &other)
    : m_hash(other.m_hash), m_compare(other.m_compare), m_size(other.m_size)
{
  try
  {
    m_buckets = other.m_buckets;
  }
  catch (...)
  {
    m_buckets.clear();
    m_size = 0;
  }
}

RKMHashTable &RKMHashTable::operator=(const RKMHashTable &other)
{
  if (this == &other)
    return *this;
  m_hash = other.m_hash;
  m_compare = other.m_compare;
  try
  {
    m_buckets = other.m_buckets;
    m_size = other.m_size;
  }
  catch (...)
  {
    m_buckets.clear();
    m_size = 0;
  }
  return *this;
}

unsigned RKMHashTable::Bucket(const void *element) const
{
  const unsigned h = m_hash ? m_hash(element) : AddressHash(element);
  return h % static_cast<unsigned>(m_buckets.size());
}

bool RKMHashTable::Equal(const void *a, const void *b) const { return m_compare ? m_compare(a, b) == 0 : a == b; }

bool RKMHashTable::Rehash(size_t buckets)
{
  try
  {
    std::vector<std::vector<void *>> fresh(buckets);
    std::swap(fresh, m_buckets);
    for (std::vector<void *> &chain : fresh)
      for (void *e : chain)
        m_buckets[Bucket(e)].push_back(e);
    return true;
  }
  catch (...)
  {
    return false;
  }
}

HRESULT RKMHashTable::Insert(const void *element)
{
  if (!element)
    return E_INVALIDARG;
  if (m_buckets.empty() && !Rehash(16))
    return E_OUTOFMEMORY;
  if (Locate(element))
    return S_FALSE;
  if (static_cast<size_t>(m_size) >= m_buckets.size())
    Rehash(m_buckets.size() * 2 + 1);
  try
  {
    m_buckets[Bucket(element)].push_back(const_cast<void *>(element));
  }
  catch (...)
  {
    return E_OUTOFMEMORY;
  }
  ++m_size;
  return S_OK;
}

void *RKMHashTable::Locate(const void *element) const
{
  if (!element || m_buckets.empty())
    return nullptr;
  for (void *e : m_buckets[Bucket(element)])
    if (Equal(e, element))
      return e;
  return nullptr;
}

void *RKMHashTable::Remove(const void *element)
{
  if (!element || m_buckets.empty())
    return nullptr;
  std::vector<void *> &chain = m_buckets[Bucket(element)];
  for (size_t i = 0; i < chain.size(); ++i)
    if (Equal(chain[i], element))
    {
      void *found = chain[i];
      chain.erase(chain.begin() + static_cast<std::ptrdiff_t>(i));
      --m_size;
      return found;
    }
  return nullptr;
}

void RKMHashTable::RemoveAll()
{
  for (std::vector<void *> &chain : m_buckets)
    chain.clear();
  m_size = 0;
}

void *RKMHashTable::Retrieve(int bucket, int rank) const
{
  if (bucket < 0 || rank < 0 || static_cast<size_t>(bucket) >= m_buckets.size())
    return nullptr;
  const std::vector<void *> &chain = m_buckets[static_cast<size_t>(bucket)];
  return static_cast<size_t>(rank) < chain.size() ? chain[static_cast<size_t>(rank)] : nullptr;
}

RKMHashCodeIter::RKMHashCodeIter(const RKMHashTable &table) : m_table(&table) {}

void *RKMHashCodeIter::operator++(int)
{
  const std::vector<std::vector<void *>> &buckets = m_table->m_buckets;
  while (m_bucket < buckets.size())
  {
    if (m_rank < buckets[m_bucket].size())
      return buckets[m_bucket][m_rank++];
    ++m_bucket;
    m_rank = 0;
  }
  return nullptr;
}

void RKMHashCodeIter::Reset()
{
  m_bucket = 0;
  m_rank = 0;
}
