#pragma once

/// Vector of two doubles.
class RKMMathVector2D
{
public:
  double x = 0.0, y = 0.0;

  constexpr RKMMathVector2D() = default;
  constexpr RKMMathVector2D(double ix, double iy) : x(ix), y(iy) {}

  constexpr RKMMathVector2D operator+(const RKMMathVector2D &v) const { return {x + v.x, y + v.y}; }
  constexpr RKMMathVector2D operator-(const RKMMathVector2D &v) const { return {x - v.x, y - v.y}; }
  constexpr RKMMathVector2D operator*(double s) const { return {x * s, y * s}; }
  /// Dot product.
  constexpr double operator*(const RKMMathVector2D &v) const { return x * v.x + y * v.y; }
  /// z component of the 3D cross product: positive when v turns counter-clockwise from this.
  constexpr double operator^(const RKMMathVector2D &v) const { return x * v.y - y * v.x; }
  constexpr bool operator==(const RKMMathVector2D &v) const { return x == v.x && y == v.y; }
  constexpr double SquareNorm() const { return x * x + y * y; }
};

/// Point of two doubles; the difference of two points is an RKMMathVector2D.
class RKMMathPoint2D
{
public:
  double x = 0.0, y = 0.0;

  constexpr RKMMathPoint2D() = default;
  constexpr RKMMathPoint2D(double ix, double iy) : x(ix), y(iy) {}

  constexpr RKMMathVector2D operator-(const RKMMathPoint2D &p) const { return {x - p.x, y - p.y}; }
  constexpr RKMMathPoint2D operator+(const RKMMathVector2D &v) const { return {x + v.x, y + v.y}; }
  constexpr bool operator==(const RKMMathPoint2D &p) const { return x == p.x && y == p.y; }
  constexpr double SquareDistanceTo(const RKMMathPoint2D &p) const { return (*this - p).SquareNorm(); }
};
