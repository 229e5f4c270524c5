#pragma once

#include "RKMHTableTyped.h"

/// Map of int keys to pointer values, hashed by the key itself; no allocation up to 31 entries.
class RKMHTableOfIntToPtr : public RKMTypedMap<int, void *, RKMHTableDetail::FixedK<&RKMHashIntWord>>
{
public:
  using RKMTypedMap<int, void *, RKMHTableDetail::FixedK<&RKMHashIntWord>>::RKMTypedMap;
};
