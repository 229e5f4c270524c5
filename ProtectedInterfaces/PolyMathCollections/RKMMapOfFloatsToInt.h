#pragma once

#include "RKMInternedTripleMap.h"
#include "RKMSetOfFloatPoints.h"

/// Map of float triples (copied into the map's pool) to ints.
class RKMMapOfFloatsToInt : public RKMInternedTripleMap<RKMSetOfFloatPoints, float, int>
{
public:
  using RKMInternedTripleMap<RKMSetOfFloatPoints, float, int>::RKMInternedTripleMap;
};
