#pragma once

#include "RKMHTableTyped.h"

/// Map of pointer keys to pointer values, hashed by the address shifted right by 2; no allocation up to 31 entries.
class RKMMapOfPtrToPtr : public RKMTypedMap<void *, void *, RKMHTableDetail::FixedK<&RKMDefaultWordHash>>
{
public:
  using RKMTypedMap<void *, void *, RKMHTableDetail::FixedK<&RKMDefaultWordHash>>::RKMTypedMap;
};
