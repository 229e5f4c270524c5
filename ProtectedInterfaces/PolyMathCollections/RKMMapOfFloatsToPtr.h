#pragma once

#include "RKMInternedTripleMap.h"
#include "RKMSetOfFloatPoints.h"

/// Map of float triples (copied into the map's pool) to pointers.
class RKMMapOfFloatsToPtr : public RKMInternedTripleMap<RKMSetOfFloatPoints, float, void *>
{
public:
  using RKMInternedTripleMap<RKMSetOfFloatPoints, float, void *>::RKMInternedTripleMap;
};
