#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <cstddef>
#include <vector>

/// Hash of an element of an RKMHashTable.
typedef unsigned int (*RKMHashTableHash)(const void *element);
/// Equality of two elements of an RKMHashTable: 0 when equal.
typedef int (*RKMHashTableCompare)(const void *a, const void *b);

/// Chained hash table of untyped, non-null element pointers; the elements are not owned.
/// Memory shortage is reported by Insert, never thrown.
class RKM_EXPORT RKMHashTable
{
public:
  /// Without a hash function, the address is hashed; without a comparison, addresses are compared.
  RKMHashTable(RKMHashTableHash hash, RKMHashTableCompare compare, int initialSize = 0);
  RKMHashTable(const RKMHashTable &other);
  RKMHashTable &operator=(const RKMHashTable &other);

  /// S_OK when added; S_FALSE when an equal element is present (nothing added); E_INVALIDARG for null;
  /// E_OUTOFMEMORY.
  HRESULT Insert(const void *element);
  /// The stored element equal to element, or null.
  void *Locate(const void *element) const;
  /// Removes the stored element equal to element and gives it, or null when absent.
  void *Remove(const void *element);
  void RemoveAll();
  int Size() const { return m_size; }
  int GetBucketCount() const { return static_cast<int>(m_buckets.size()); }
  /// The element of rank (from 0) in bucket (from 0), or null.
  void *Retrieve(int bucket, int rank) const;

private:
  friend class RKMHashCodeIter;
  unsigned Bucket(const void *element) const;
  bool Equal(const void *a, const void *b) const;
  bool Rehash(size_t buckets);

  RKMHashTableHash m_hash;
  RKMHashTableCompare m_compare;
  std::vector<std::vector<void *>> m_buckets;
  int m_size = 0;
};

/// Walks every element of an RKMHashTable, bucket by bucket. The table must not change meanwhile.
class RKM_EXPORT RKMHashCodeIter
{
public:
  explicit RKMHashCodeIter(const RKMHashTable &table);
  /// The next element, null at the end.
  void *operator++(int);
  /// Starts again from the first element.
  void Reset();

private:
  const RKMHashTable *m_table;
  size_t m_bucket = 0;
  size_t m_rank = 0;
};
