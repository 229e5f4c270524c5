#pragma once

#include <cmath>

/// Vector of three floats; arithmetic is done in float.
class RKMMathVectorf
{
public:
  float x = 0.0f, y = 0.0f, z = 0.0f;

  constexpr RKMMathVectorf() = default;
  constexpr RKMMathVectorf(float ix, float iy, float iz) : x(ix), y(iy), z(iz) {}

  constexpr RKMMathVectorf operator+(const RKMMathVectorf &v) const { return {x + v.x, y + v.y, z + v.z}; }
  constexpr RKMMathVectorf operator-(const RKMMathVectorf &v) const { return {x - v.x, y - v.y, z - v.z}; }
  constexpr RKMMathVectorf operator-() const { return {-x, -y, -z}; }
  constexpr RKMMathVectorf operator*(float s) const { return {x * s, y * s, z * s}; }
  /// Dot product.
  constexpr float operator*(const RKMMathVectorf &v) const { return x * v.x + y * v.y + z * v.z; }
  /// Cross product.
  constexpr RKMMathVectorf operator^(const RKMMathVectorf &v) const
  {
    return {y * v.z - z * v.y, z * v.x - x * v.z, x * v.y - y * v.x};
  }
  constexpr bool operator==(const RKMMathVectorf &v) const { return x == v.x && y == v.y && z == v.z; }
  float Norm() const { return std::sqrt(x * x + y * y + z * z); }
};

/// Point of three floats.
class RKMMathPointf
{
public:
  float x = 0.0f, y = 0.0f, z = 0.0f;

  constexpr RKMMathPointf() = default;
  constexpr RKMMathPointf(float ix, float iy, float iz) : x(ix), y(iy), z(iz) {}

  constexpr RKMMathVectorf operator-(const RKMMathPointf &p) const { return {x - p.x, y - p.y, z - p.z}; }
  constexpr RKMMathPointf operator+(const RKMMathVectorf &v) const { return {x + v.x, y + v.y, z + v.z}; }
  constexpr bool operator==(const RKMMathPointf &p) const { return x == p.x && y == p.y && z == p.z; }
};
