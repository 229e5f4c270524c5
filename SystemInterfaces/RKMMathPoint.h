#pragma once

#include "RKMMathVector.h"

/// Point of three doubles; the difference of two points is an RKMMathVector.
class RKMMathPoint
{
public:
  double x = 0.0, y = 0.0, z = 0.0;

  constexpr RKMMathPoint() = default;
  constexpr RKMMathPoint(double ix, double iy, double iz) : x(ix), y(iy), z(iz) {}
  constexpr explicit RKMMathPoint(const RKMMathVector &v) : x(v.x), y(v.y), z(v.z) {}

  double &operator[](int i) { return i == 0 ? x : (i == 1 ? y : z); }
  double operator[](int i) const { return i == 0 ? x : (i == 1 ? y : z); }

  constexpr RKMMathVector operator-(const RKMMathPoint &p) const { return {x - p.x, y - p.y, z - p.z}; }
  constexpr RKMMathPoint operator+(const RKMMathVector &v) const { return {x + v.x, y + v.y, z + v.z}; }
  constexpr RKMMathPoint operator-(const RKMMathVector &v) const { return {x - v.x, y - v.y, z - v.z}; }
  RKMMathPoint &operator+=(const RKMMathVector &v) { x += v.x; y += v.y; z += v.z; return *this; }
  RKMMathPoint &operator-=(const RKMMathVector &v) { x -= v.x; y -= v.y; z -= v.z; return *this; }
  constexpr bool operator==(const RKMMathPoint &p) const { return x == p.x && y == p.y && z == p.z; }
  constexpr bool operator!=(const RKMMathPoint &p) const { return !(*this == p); }

  constexpr RKMMathVector AsVector() const { return {x, y, z}; }
  constexpr double SquareDistanceTo(const RKMMathPoint &p) const { return (*this - p).SquareNorm(); }
  double DistanceTo(const RKMMathPoint &p) const { return (*this - p).Norm(); }
};
