#pragma once

#include "RKMInternedTripleMap.h"
#include "RKMSetOf3Doubles.h"

/// Map of the caller's double triples (kept by address: the caller keeps them alive and unchanged) to ints.
class RKMMapOf3DoublesToInt : public RKMInternedTripleMap<RKMSetOf3Doubles, double, int>
{
public:
  using RKMInternedTripleMap<RKMSetOf3Doubles, double, int>::RKMInternedTripleMap;
};
