#pragma once

#include "RKMHTableTyped.h"

/// Map of pointer keys to int values, hashed by the address shifted right by 2; no allocation up to 31 entries.
class RKMHTableOfPtrToInt : public RKMTypedMap<void *, int, RKMHTableDetail::FixedK<&RKMDefaultWordHash>>
{
public:
  using RKMTypedMap<void *, int, RKMHTableDetail::FixedK<&RKMDefaultWordHash>>::RKMTypedMap;
};
