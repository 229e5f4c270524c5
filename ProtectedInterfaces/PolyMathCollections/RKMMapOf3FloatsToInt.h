#pragma once

#include "RKMInternedTripleMap.h"
#include "RKMSetOf3Floats.h"

/// Map of the caller's float triples (kept by address: the caller keeps them alive and unchanged) to ints.
class RKMMapOf3FloatsToInt : public RKMInternedTripleMap<RKMSetOf3Floats, float, int>
{
public:
  using RKMInternedTripleMap<RKMSetOf3Floats, float, int>::RKMInternedTripleMap;
};
