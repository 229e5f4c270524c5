#pragma once

#include "RKMExport.h"
#include "RKMHashTable.h"
#include "RKMSysTypes.h"

/// Map of keys of N floats (N fixed at construction) to ints. Keys are equal when every float is equal
/// (−0 equals +0) or has the same bit pattern (so a NaN key can be found again).
class RKM_EXPORT RKMMapOfNFloatsToInt
{
public:
  /// N below 1 is taken as 1.
  explicit RKMMapOfNFloatsToInt(int n, int size = 0);
  RKMMapOfNFloatsToInt(const RKMMapOfNFloatsToInt &other);
  RKMMapOfNFloatsToInt &operator=(const RKMMapOfNFloatsToInt &other);
  ~RKMMapOfNFloatsToInt();

  /// S_OK when added; S_FALSE when the key maps to this value already, E_FAIL when it maps to another
  /// (kept); E_INVALIDARG for a null key; E_OUTOFMEMORY.
  HRESULT Insert(const float *key, int value);
  /// S_FALSE when the key maps to this value already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(const float *key, int value);
  /// True and the value when the key is present; value untouched otherwise.
  unsigned char Locate(const float *key, int &value) const;
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(const float *key);
  void RemoveAll();
  int Size() const { return m_table.Size(); }
  int GetN() const { return m_n; }

private:
  void *Find(const float *key) const;
  void CopyFrom(const RKMMapOfNFloatsToInt &other);

  int m_n;
  RKMHashTable m_table;
};
