#pragma once

#include "RKMHTableTyped.h"

/// Map of pairs of pointers to int values; keys compared word by word unless the caller gives a function.
class RKMMapOfPtrPtrToInt : public RKMTypedMap2<void *, int, RKMHTableDetail::GenericKK>
{
public:
  explicit RKMMapOfPtrPtrToInt(int size = 0, RKMCompareFunction4 cmp = nullptr)
      : RKMTypedMap2(size, RKMHTableDetail::GenericKK{nullptr, cmp})
  {
  }
};
