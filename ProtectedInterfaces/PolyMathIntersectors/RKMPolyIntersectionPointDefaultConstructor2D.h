#pragma once

#include "RKMPolyIntersectionPointConstructor2D.h"

/// The closest extremity within the tolerance when there is one, otherwise the crossing of the two
/// lines clamped into both segments' boxes.
class RKM_EXPORT RKMPolyIntersectionPointDefaultConstructor2D : public RKMPolyIntersectionPointConstructor2D
{
public:
  explicit RKMPolyIntersectionPointDefaultConstructor2D(double tolerance);
  HRESULT Compute(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c, const RKMMathPoint2D &d,
                  RKMMathPoint2D &out) const override;

private:
  double m_tolerance;
};
