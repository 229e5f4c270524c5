#pragma once

#include "RKMExport.h"
#include "RKMMathPoint.h"
#include "RKMSysTypes.h"

/// Axis-aligned box of doubles, closed. Empty when default-built or when min > max on any axis.
/// A NaN entering as a limit, a point coordinate or an inflation leaves that side unbounded (±inf),
/// so the box never loses what it was given.
class RKM_EXPORT RKMMathBox
{
public:
  /// The empty box.
  RKMMathBox();
  /// From six limits; inverted limits give an empty box.
  RKMMathBox(double xmin, double xmax, double ymin, double ymax, double zmin, double zmax);
  /// The smallest box holding both corners, whatever their order.
  RKMMathBox(const RKMMathPoint &a, const RKMMathPoint &b);

  unsigned char IsEmpty() const;
  void SetToEmpty();

  /// E_FAIL with the outputs untouched when empty, else S_OK.
  HRESULT GetLimits(double &xmin, double &xmax, double &ymin, double &ymax, double &zmin, double &zmax) const;
  /// The stored limits, also when empty.
  void GetExtremities(double &xmin, double &xmax, double &ymin, double &ymax, double &zmin, double &zmax) const;
  void SetExtremities(double xmin, double xmax, double ymin, double ymax, double zmin, double zmax);
  /// Corner of the smallest coordinates; meaningless when empty.
  RKMMathPoint GetLow() const { return {m_min[0], m_min[1], m_min[2]}; }
  /// Corner of the largest coordinates; meaningless when empty.
  RKMMathPoint GetHigh() const { return {m_max[0], m_max[1], m_max[2]}; }

  void AddInside(const RKMMathPoint &p);
  void AddInside(const RKMMathBox &b);
  /// Moves every limit outward by d (inward when d < 0, which may empty the box); nothing when empty.
  void Inflate(double d);

  /// Closed test with a tolerance that widens the box; false when empty.
  unsigned char IsContaining(const RKMMathPoint &p, double tolerance = 0.0) const;
  /// Closed test; touching boxes intersect. False when either box is empty.
  unsigned char IsIntersecting(const RKMMathBox &b, double tolerance = 0.0) const;

  /// 0 inside; RKMdoubleMax when empty.
  double SquareDistanceTo(const RKMMathPoint &p) const;
  double DistanceTo(const RKMMathPoint &p) const;
  /// Squared gap between the boxes, 0 when they meet; RKMdoubleMax when either is empty.
  double SquareDistanceTo(const RKMMathBox &b) const;

  /// 0 when empty.
  double Volume() const;

  bool operator==(const RKMMathBox &b) const;
  bool operator!=(const RKMMathBox &b) const { return !(*this == b); }

private:
  double m_min[3];
  double m_max[3];
};
