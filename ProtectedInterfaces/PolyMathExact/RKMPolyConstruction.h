#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathBox;
class RKMMathPlane;
class RKMMathPoint;

/// Intersection points built in plain floating point from a crossing the caller has established
/// exactly, then clamped into the boxes of their inputs. Each returns S_OK, or E_FAIL with out
/// unchanged when the configuration has no single crossing point (both ends on the plane, parallel
/// segments) or the computation is not finite.
class RKM_EXPORT RKMPolyConstruction
{
public:
  /// Where segment pq crosses the plane of triangle abc.
  static HRESULT ConstructIntersection(const RKMMathPoint &p, const RKMMathPoint &q, const RKMMathPoint &a,
                                       const RKMMathPoint &b, const RKMMathPoint &c, RKMMathPoint &out);
  /// Where the coplanar segments p0p1 and q0q1 cross; the point lies on q0q1.
  static HRESULT ConstructIntersection(const RKMMathPoint &p0, const RKMMathPoint &p1, const RKMMathPoint &q0,
                                       const RKMMathPoint &q1, RKMMathPoint &out);
  /// Where segment pq crosses the plane; the same point whichever end is given first.
  static HRESULT ConstructIntersection(const RKMMathPoint &p, const RKMMathPoint &q, const RKMMathPlane &plane,
                                       RKMMathPoint &out);
  /// Clamps p into the box, coordinate by coordinate.
  static void ProjectToBoundingBox(const RKMMathBox &box, RKMMathPoint &p);
};
