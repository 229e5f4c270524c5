#pragma once

#include "RKMMathVector.h"

/// A unit vector. Built from a vector, it is normalised; a zero or non-finite vector gives (1, 0, 0).
class RKMMathDirection : public RKMMathVector
{
public:
  RKMMathDirection() : RKMMathVector(1.0, 0.0, 0.0) {}
  RKMMathDirection(double ix, double iy, double iz) : RKMMathDirection(RKMMathVector(ix, iy, iz)) {}
  explicit RKMMathDirection(const RKMMathVector &v) : RKMMathVector(v)
  {
    if (FAILED(Normalize()))
      *static_cast<RKMMathVector *>(this) = RKMMathVector(1.0, 0.0, 0.0);
  }
};
