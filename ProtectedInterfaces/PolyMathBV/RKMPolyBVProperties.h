#pragma once

#include "RKMExport.h"
#include "RKMMathDirection.h"
#include "RKMMathPoint.h"

class RKMPolyBoundingVolume;

/// Kind-independent questions about a volume. Empty volumes have radius and volume 0 and contain
/// nothing; a null volume is empty, centred at the origin; an unknown kind is treated as empty.
class RKM_EXPORT RKMPolyBVProperties
{
public:
  virtual ~RKMPolyBVProperties();

  static RKMMathPoint GetCenter(const RKMPolyBoundingVolume *bv);
  /// A rough size: 0.87 × the largest extent of a box, the radius of a sphere, radius + limit of a
  /// capsule, RKMMathInfinite for an infinite cylinder, 1e40 for a slab.
  static double GetRadius(const RKMPolyBoundingVolume *bv);
  /// The ranking volume used by the hierarchy builders (1.3333·π·r³ for a sphere, π·r²·limit for a
  /// capsule, 1e30 for an infinite cylinder, thickness × 1e60 for a slab).
  static double GetVolume(const RKMPolyBoundingVolume *bv);
  static unsigned char IsEmpty(const RKMPolyBoundingVolume *bv);
  /// Closed containment: a point on the boundary is inside.
  static unsigned char IsPointInsideBV(const RKMPolyBoundingVolume &bv, const RKMMathPoint &p);
  /// True when the half-line origin + t·direction, t ≥ 0, meets the volume.
  static unsigned char IsRayIntersectingBV(const RKMPolyBoundingVolume &bv, const RKMMathPoint &origin,
                                           const RKMMathDirection &direction);
};
