#pragma once

#include "RKMExport.h"
#include "RKMHTableTyped.h"
#include "RKMMapOfIntToFloat.h"

/// Map of ordered pairs (i, j) of ints to floats, stored as j → (i → float); the inner map of a j is
/// created on its first pair and freed with its last.
class RKM_EXPORT RKMMapOfIntIntToFloat
{
public:
  explicit RKMMapOfIntIntToFloat(int size = 0);
  /// A deep copy; when memory runs out it holds nothing and IsValid is false.
  RKMMapOfIntIntToFloat(const RKMMapOfIntIntToFloat &other);
  RKMMapOfIntIntToFloat &operator=(const RKMMapOfIntIntToFloat &other);
  ~RKMMapOfIntIntToFloat();

  /// S_OK when added; S_FALSE when the pair maps to this value already, E_FAIL when it maps to another
  /// (kept); E_OUTOFMEMORY, leaving nothing behind.
  HRESULT Insert(int i, int j, float value);
  /// S_FALSE when the pair maps to this value already; otherwise stores it and gives S_OK.
  HRESULT InsertOrUpdate(int i, int j, float value);
  /// True and the value when the pair is present; value untouched otherwise.
  unsigned char Locate(int i, int j, float &value) const;
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(int i, int j);
  void RemoveAll();
  /// The number of pairs.
  int Size() const { return m_size; }
  /// The map i → value of the pairs (i, j), or null when j has none. Owned by this map.
  const RKMMapOfIntToFloat *GetColumn(int j) const;
  unsigned char IsValid() const { return m_valid; }

private:
  typedef RKMTypedMap<int, RKMMapOfIntToFloat *, RKMHTableDetail::FixedK<&RKMHashIntWord>> Columns;
  HRESULT Store(int i, int j, float value, bool update);
  void CopyFrom(const RKMMapOfIntIntToFloat &other);

  Columns m_columns;
  int m_size = 0;
  bool m_valid = true;
};
