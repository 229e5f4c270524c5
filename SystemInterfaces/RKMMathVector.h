#pragma once

#include "RKMSysTypes.h"

#include <cmath>
#include <limits>

/// Vector of three doubles.
class RKMMathVector
{
public:
  double x = 0.0, y = 0.0, z = 0.0;

  constexpr RKMMathVector() = default;
  constexpr RKMMathVector(double ix, double iy, double iz) : x(ix), y(iy), z(iz) {}

  double &operator[](int i) { return i == 0 ? x : (i == 1 ? y : z); }
  double operator[](int i) const { return i == 0 ? x : (i == 1 ? y : z); }

  constexpr RKMMathVector operator+(const RKMMathVector &v) const { return {x + v.x, y + v.y, z + v.z}; }
  constexpr RKMMathVector operator-(const RKMMathVector &v) const { return {x - v.x, y - v.y, z - v.z}; }
  constexpr RKMMathVector operator-() const { return {-x, -y, -z}; }
  constexpr RKMMathVector operator*(double s) const { return {x * s, y * s, z * s}; }
  constexpr RKMMathVector operator/(double s) const { return {x / s, y / s, z / s}; }
  /// Dot product.
  constexpr double operator*(const RKMMathVector &v) const { return x * v.x + y * v.y + z * v.z; }
  /// Cross product.
  constexpr RKMMathVector operator^(const RKMMathVector &v) const
  {
    return {y * v.z - z * v.y, z * v.x - x * v.z, x * v.y - y * v.x};
  }
  RKMMathVector &operator+=(const RKMMathVector &v) { x += v.x; y += v.y; z += v.z; return *this; }
  RKMMathVector &operator-=(const RKMMathVector &v) { x -= v.x; y -= v.y; z -= v.z; return *this; }
  RKMMathVector &operator*=(double s) { x *= s; y *= s; z *= s; return *this; }
  constexpr bool operator==(const RKMMathVector &v) const { return x == v.x && y == v.y && z == v.z; }
  constexpr bool operator!=(const RKMMathVector &v) const { return !(*this == v); }

  constexpr double Dot(const RKMMathVector &v) const { return *this * v; }
  constexpr RKMMathVector Cross(const RKMMathVector &v) const { return *this ^ v; }
  constexpr double SquareNorm() const { return x * x + y * y + z * z; }
  /// Euclidean norm, computed scaled so that it neither overflows nor underflows; NaN when a
  /// component is NaN.
  double Norm() const
  {
    if (std::isnan(x) || std::isnan(y) || std::isnan(z))
      return std::numeric_limits<double>::quiet_NaN();
    const double m = LargestMagnitude();
    if (m == 0.0 || std::isinf(m))
      return m;
    const double a = x / m, b = y / m, c = z / m;
    return m * std::sqrt(a * a + b * b + c * c);
  }
  /// Scales to unit length in place. A zero or non-finite vector is left unchanged and gives E_FAIL.
  HRESULT Normalize()
  {
    if (!std::isfinite(x) || !std::isfinite(y) || !std::isfinite(z))
      return E_FAIL;
    const double m = LargestMagnitude();
    if (m == 0.0)
      return E_FAIL;
    const double a = x / m, b = y / m, c = z / m;
    const double n = std::sqrt(a * a + b * b + c * c);
    x = a / n;
    y = b / n;
    z = c / n;
    return S_OK;
  }
  /// Angle to v in radians, in [0, pi]; 0 when either vector is zero.
  double GetAngleTo(const RKMMathVector &v) const { return std::atan2((*this ^ v).Norm(), *this * v); }

private:
  double LargestMagnitude() const { return std::fmax(std::fabs(x), std::fmax(std::fabs(y), std::fabs(z))); }
};

inline constexpr RKMMathVector operator*(double s, const RKMMathVector &v) { return v * s; }
