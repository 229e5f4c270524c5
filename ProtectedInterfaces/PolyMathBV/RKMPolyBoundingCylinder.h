#pragma once

#include "RKMExport.h"
#include "RKMMathPoint.h"
#include "RKMPolyBoundingVolume.h"

/// The points within radius of the axis segment centre ± s·direction, |s| ≤ limit (a capsule), or of
/// the whole axis line when limit < 0 (an infinite cylinder). A negative radius contains nothing.
class RKM_EXPORT RKMPolyBoundingCylinder : public RKMPolyBoundingVolume
{
public:
  /// Centre (0, 0, 0), direction (1, 0, 0), radius 0, infinite.
  RKMPolyBoundingCylinder() = default;
  /// The direction is normalised by NormalizeDirection; radius and limit are stored as given.
  RKMPolyBoundingCylinder(const RKMMathPoint &center, const RKMMathVector &direction, double radius, double limit);

  HRESULT Accept(RKMPolyBVConstVisitor &visitor) const override;
  TypeID GetTypeID() const override { return TypeCylinder; }

  /// Stores centre, normalised direction and radius; the limit only when it is > 0 (a limit ≤ 0 keeps
  /// the one the cylinder had).
  void Set(const RKMMathPoint &center, const RKMMathVector &direction, double radius, double limit);
  const RKMMathPoint &GetCenter() const { return m_center; }
  const RKMMathVector &GetDirection() const { return m_direction; }
  double GetRadius() const { return m_radius; }
  double GetLimit() const { return m_limit; }
  double GetHalfHeight() const { return m_limit; }
  unsigned char IsInfinite() const { return m_limit < 0.0; }

  /// The direction rule: a vector of squared length exactly 1 is kept, an all-zero vector becomes
  /// (1, 0, 0), any other is scaled to unit length without overflow or underflow (NaN stays NaN).
  static void NormalizeDirection(RKMMathVector &v);

private:
  RKMMathPoint m_center;
  RKMMathVector m_direction{1.0, 0.0, 0.0};
  double m_radius = 0.0;
  double m_limit = -1.0;
};
