#include "RKMMapOfNFloatsToInt.h"

#include "RKMMathFloat.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <vector>

namespace
{
// A heap record: n, the value, then the n floats of the key. Each record carries n so that the table's
// plain hash and comparison functions can read it.
struct Record
{
  int n;
  int value;
  float *Key() { return reinterpret_cast<float *>(this + 1); }
  const float *Key() const { return reinterpret_cast<const float *>(this + 1); }
};

Record *NewRecord(int n, const float *key, int value)
{
  Record *r = static_cast<Record *>(std::malloc(sizeof(Record) + sizeof(float) * static_cast<size_t>(n)));
  if (!r)
    return nullptr;
  r->n = n;
  r->value = value;
  std::memcpy(r->Key(), key, sizeof(float) * static_cast<size_t>(n));
  return r;
}

unsigned HashRecord(const void *p)
{
  const Record *r = static_cast<const Record *>(p);
  std::uint32_t h = 0;
  for (int i = 0; i < r->n; ++i)
    h += RKMFoldedFloatBits(r->Key()[i]);
  return h;
}

int CompareRecords(const void *x, const void *y)
{
  const Record *a = static_cast<const Record *>(x), *b = static_cast<const Record *>(y);
  for (int i = 0; i < a->n; ++i)
  {
    const float u = a->Key()[i], v = b->Key()[i];
    if (!(u == v) && std::memcmp(&u, &v, sizeof u) != 0)
      return 1;
  }
  return 0;
}

void FreeAll(RKMHashTable &table)
{
  RKMHashCodeIter it(table);
  while (void *p = it++)
    std::free(p);
  table.RemoveAll();
}
}

RKMMapOfNFloatsToInt::RKMMapOfNFloatsToInt(int n, int size)
    : m_n(n < 1 ? 1 : n), m_table(HashRecord, CompareRecords, size)
{
}

RKMMapOfNFloatsToInt::RKMMapOfNFloatsToInt(const RKMMapOfNFloatsToInt &other)
    : m_n(other.m_n), m_table(HashRecord, CompareRecords, other.Size())
{
  CopyFrom(other);
}

RKMMapOfNFloatsToInt &RKMMapOfNFloatsToInt::operator=(const RKMMapOfNFloatsToInt &other)
{
  if (this == &other)
    return *this;
  FreeAll(m_table);
  m_n = other.m_n;
  CopyFrom(other);
  return *this;
}

RKMMapOfNFloatsToInt::~RKMMapOfNFloatsToInt() { FreeAll(m_table); }

void RKMMapOfNFloatsToInt::CopyFrom(const RKMMapOfNFloatsToInt &other)
{
  RKMHashCodeIter it(other.m_table);
  while (const Record *r = static_cast<const Record *>(it++))
    if (FAILED(Insert(r->Key(), r->value)))
    {
      FreeAll(m_table);
      return;
    }
}

void *RKMMapOfNFloatsToInt::Find(const float *key) const
{
  if (!key)
    return nullptr;
  // The probe is a record like the stored ones, built on the stack for short keys.
  alignas(Record) unsigned char local[sizeof(Record) + 16 * sizeof(float)];
  std::vector<unsigned char> heap;
  unsigned char *buffer = local;
  if (m_n > 16)
  {
    try
    {
      heap.resize(sizeof(Record) + sizeof(float) * static_cast<size_t>(m_n));
    }
    catch (...)
    {
      return nullptr;
    }
    buffer = heap.data();
  }
  Record *probe = reinterpret_cast<Record *>(buffer);
  probe->n = m_n;
  probe->value = 0;
  std::memcpy(probe->Key(), key, sizeof(float) * static_cast<size_t>(m_n));
  return m_table.Locate(probe);
}

HRESULT RKMMapOfNFloatsToInt::Insert(const float *key, int value)
{
  if (!key)
    return E_INVALIDARG;
  if (const Record *r = static_cast<const Record *>(Find(key)))
    return r->value == value ? S_FALSE : E_FAIL;
  Record *r = NewRecord(m_n, key, value);
  if (!r)
    return E_OUTOFMEMORY;
  const HRESULT hr = m_table.Insert(r);
  if (hr != S_OK)
  {
    std::free(r);
    return FAILED(hr) ? hr : E_FAIL;
  }
  return S_OK;
}

HRESULT RKMMapOfNFloatsToInt::InsertOrUpdate(const float *key, int value)
{
  if (!key)
    return E_INVALIDARG;
  if (Record *r = static_cast<Record *>(Find(key)))
  {
    if (r->value == value)
      return S_FALSE;
    r->value = value;
    return S_OK;
  }
  return Insert(key, value);
}

unsigned char RKMMapOfNFloatsToInt::Locate(const float *key, int &value) const
{
  const Record *r = static_cast<const Record *>(Find(key));
  if (!r)
    return 0;
  value = r->value;
  return 1;
}

HRESULT RKMMapOfNFloatsToInt::Remove(const float *key)
{
  void *r = Find(key);
  if (!r)
    return S_FALSE;
  std::free(m_table.Remove(r));
  return S_OK;
}

void RKMMapOfNFloatsToInt::RemoveAll() { FreeAll(m_table); }
