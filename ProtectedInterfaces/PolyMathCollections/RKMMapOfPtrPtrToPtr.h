#pragma once

#include "RKMHTableTyped.h"

/// Map of pairs of pointers to pointer values; keys compared word by word unless the caller gives a function.
class RKMMapOfPtrPtrToPtr : public RKMTypedMap2<void *, void *, RKMHTableDetail::GenericKK>
{
public:
  explicit RKMMapOfPtrPtrToPtr(int size = 0, RKMCompareFunction4 cmp = nullptr)
      : RKMTypedMap2(size, RKMHTableDetail::GenericKK{nullptr, cmp})
  {
  }
};
