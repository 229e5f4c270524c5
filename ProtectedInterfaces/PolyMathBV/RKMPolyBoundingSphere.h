#pragma once

#include "RKMExport.h"
#include "RKMMathPoint.h"
#include "RKMPolyBoundingVolume.h"

/// Ball of a centre and a radius; a radius ≤ 0 makes it empty (a negative radius contains nothing).
class RKM_EXPORT RKMPolyBoundingSphere : public RKMPolyBoundingVolume
{
public:
  /// Centre (0, 0, 0), radius 0.
  RKMPolyBoundingSphere() = default;
  RKMPolyBoundingSphere(const RKMMathPoint &center, double radius) : m_center(center), m_radius(radius) {}

  HRESULT Accept(RKMPolyBVConstVisitor &visitor) const override;
  TypeID GetTypeID() const override { return TypeSphere; }

  void Set(const RKMMathPoint &center, double radius)
  {
    m_center = center;
    m_radius = radius;
  }
  const RKMMathPoint &GetCenter() const { return m_center; }
  double GetRadius() const { return m_radius; }

private:
  RKMMathPoint m_center;
  double m_radius = 0.0;
};
