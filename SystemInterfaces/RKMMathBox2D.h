#pragma once

#include "RKMExport.h"
#include "RKMMathPoint2D.h"
#include "RKMSysTypes.h"

/// Axis-aligned rectangle of doubles, closed; empty when default-built. A NaN coordinate added
/// leaves that side unbounded.
class RKM_EXPORT RKMMathBox2D
{
public:
  RKMMathBox2D();
  RKMMathBox2D(double xmin, double xmax, double ymin, double ymax);

  unsigned char IsEmpty() const;
  void SetToEmpty();
  void AddInside(const RKMMathPoint2D &p);
  void AddInside(const RKMMathBox2D &b);
  /// E_FAIL with the outputs untouched when empty, else S_OK.
  HRESULT GetLimits(double &xmin, double &xmax, double &ymin, double &ymax) const;
  void SetExtremities(double xmin, double xmax, double ymin, double ymax);
  unsigned char IsContaining(const RKMMathPoint2D &p, double tolerance = 0.0) const;
  unsigned char IsIntersecting(const RKMMathBox2D &b, double tolerance = 0.0) const;

private:
  double m_min[2];
  double m_max[2];
};
