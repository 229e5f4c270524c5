#pragma once

#include "RKMPolyIntersectionPointConstructor2D.h"

/// Takes as crossing point the extremity of one segment that lies closest to the other segment's line
/// (an extremity outside the other segment's closed box does not count); E_FAIL when that distance
/// exceeds the tolerance.
class RKM_EXPORT RKMPolyIntersectionPointClosestPointConstructor2D : public RKMPolyIntersectionPointConstructor2D
{
public:
  explicit RKMPolyIntersectionPointClosestPointConstructor2D(double tolerance);
  HRESULT Compute(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                  RKMMathPoint2D &out) const override;
  /// Which of a, b, c, d (1 to 4) lies closest to the other segment's line (to its first point when
  /// that segment is a single point); ties go to the earlier one; sqDistance receives its squared
  /// distance.
  static int FindClosestExtremity(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                  const RKMMathPoint2D &d, double &sqDistance);

private:
  double m_tolerance;
};
