#pragma once

#include "RKMHTableTyped.h"

/// Map of int keys to int values, hashed by the key itself; no allocation up to 31 entries.
class RKMMapOfIntToInt : public RKMTypedMap<int, int, RKMHTableDetail::FixedK<&RKMHashIntWord>>
{
public:
  using RKMTypedMap<int, int, RKMHTableDetail::FixedK<&RKMHashIntWord>>::RKMTypedMap;
};
