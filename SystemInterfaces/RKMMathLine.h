#pragma once

#include "RKMExport.h"
#include "RKMMathPoint.h"

/// An infinite line through an origin along a direction (not necessarily of unit length).
class RKM_EXPORT RKMMathLine
{
public:
  /// The x axis.
  RKMMathLine();
  RKMMathLine(const RKMMathPoint &origin, const RKMMathVector &direction);

  const RKMMathPoint &GetOrigin() const { return m_origin; }
  const RKMMathVector &GetDirection() const { return m_direction; }
  /// The point of the line closest to p; the origin when the direction is null.
  RKMMathPoint Project(const RKMMathPoint &p) const;
  double SquareDistanceTo(const RKMMathPoint &p) const;
  double DistanceTo(const RKMMathPoint &p) const;

private:
  RKMMathPoint m_origin;
  RKMMathVector m_direction;
};
