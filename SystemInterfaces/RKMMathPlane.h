#pragma once

#include "RKMExport.h"
#include "RKMMathPoint.h"

/// A plane through an origin, spanned by two directions; the normal is their normalised cross product.
class RKM_EXPORT RKMMathPlane
{
public:
  /// The plane z = 0.
  RKMMathPlane();
  RKMMathPlane(const RKMMathPoint &origin, const RKMMathVector &u, const RKMMathVector &v);

  const RKMMathPoint &GetOrigin() const { return m_origin; }
  void SetOrigin(const RKMMathPoint &origin) { m_origin = origin; }
  void GetDirections(RKMMathVector &u, RKMMathVector &v) const;
  void SetDirections(const RKMMathVector &u, const RKMMathVector &v);
  /// Unit normal u × v / |u × v|; (0, 0, 0) when the directions are parallel or null.
  RKMMathVector GetNormal() const;
  /// Unsigned distance from p to the plane; the distance to the origin when the plane is degenerate.
  double DistanceTo(const RKMMathPoint &p) const;

private:
  RKMMathPoint m_origin;
  RKMMathVector m_u, m_v;
};
