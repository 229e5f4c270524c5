#pragma once

// Exact references for the orientation predicates. The determinants are written plainly once:
// over integers (__int128, mpz_class) they give exact signs, over float or double the naive ones.
// ExactSign gives the true sign for any finite doubles; Hex and Format print inputs exactly.

#include "RKMMathPoint.h"

#include <gmpxx.h>

#include <algorithm>
#include <array>
#include <climits>
#include <cmath>
#include <cstdint>
#include <sstream>
#include <string>

namespace exactref
{
enum class Predicate
{
  Orientation2D,
  Orientation3D,
  InCircle
};
constexpr Predicate kPredicates[] = {Predicate::Orientation2D, Predicate::Orientation3D, Predicate::InCircle};
inline const char *Name(Predicate p)
{
  return std::array{"Orientation2D", "Orientation3D", "InCircle"}[static_cast<int>(p)];
}
inline void PrintTo(Predicate p, std::ostream *os) { *os << Name(p); }
inline int Dimension(Predicate p) { return p == Predicate::Orientation3D ? 3 : 2; }
inline int PointCount(Predicate p) { return p == Predicate::Orientation2D ? 3 : 4; }

// Up to four points of up to three coordinates; what a predicate does not read stays zero.
template <class T> using Points = std::array<std::array<T, 3>, 4>;
using Case = Points<double>;
using GridPoints = Points<std::int64_t>;

template <class T> int Sign(const T &v) { return (v > 0) - (v < 0); }

// Orientation2D: sign of (a − c) × (b − c). Orientation3D: ((b − a) × (c − a)) · (d − a).
// InCircle: the lifted determinant of a, b, c relative to d, positive for d inside when a, b, c
// turn counter-clockwise, made independent of their turn; collinear a, b, c keep the raw sign.
template <class T> int Reference(Predicate p, const Points<T> &v)
{
  if (p == Predicate::Orientation2D)
    return Sign(T((v[0][0] - v[2][0]) * (v[1][1] - v[2][1]) - (v[1][0] - v[2][0]) * (v[0][1] - v[2][1])));
  if (p == Predicate::Orientation3D)
  {
    const T bx = v[1][0] - v[0][0], by = v[1][1] - v[0][1], bz = v[1][2] - v[0][2];
    const T cx = v[2][0] - v[0][0], cy = v[2][1] - v[0][1], cz = v[2][2] - v[0][2];
    const T dx = v[3][0] - v[0][0], dy = v[3][1] - v[0][1], dz = v[3][2] - v[0][2];
    return Sign(T((by * cz - bz * cy) * dx + (bz * cx - bx * cz) * dy + (bx * cy - by * cx) * dz));
  }
  const T ax = v[0][0] - v[3][0], ay = v[0][1] - v[3][1];
  const T bx = v[1][0] - v[3][0], by = v[1][1] - v[3][1];
  const T cx = v[2][0] - v[3][0], cy = v[2][1] - v[3][1];
  const T al = ax * ax + ay * ay, bl = bx * bx + by * by, cl = cx * cx + cy * cy;
  const int s = Sign(T(ax * (by * cl - bl * cy) - ay * (bx * cl - bl * cx) + al * (bx * cy - by * cx)));
  return Reference(Predicate::Orientation2D, v) < 0 ? -s : s;
}

template <class T, class U> Points<T> Convert(const Points<U> &in)
{
  Points<T> out{};
  for (int i = 0; i < 4; ++i)
    for (int k = 0; k < 3; ++k)
      out[i][k] = static_cast<T>(in[i][k]);
  return out;
}

// Exact signs over finite doubles: one common power-of-two scaling turns every coordinate into an
// integer and keeps the sign of each (homogeneous, translation-invariant) determinant.
inline int ExactSign(Predicate p, const Case &c)
{
  static Points<mpz_class> z; // kept to spare the allocations
  int low = INT_MAX, e;
  for (const auto &point : c)
    for (const double v : point)
      if (v != 0.0)
        low = std::min(low, (std::frexp(v, &e), e - 53));
  for (int i = 0; i < 4; ++i)
    for (int k = 0; k < 3; ++k)
    {
      const double f = std::frexp(c[i][k], &e);
      z[i][k] = static_cast<long>(std::ldexp(f, 53));
      if (f != 0.0)
        mpz_mul_2exp(z[i][k].get_mpz_t(), z[i][k].get_mpz_t(), static_cast<mp_bitcnt_t>(e - 53 - low));
    }
  return Reference(p, z);
}

// Exactly collinear points in space: all three coordinate projections are degenerate.
inline bool Collinear(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c)
{
  for (int k = 0; k < 3; ++k)
    if (ExactSign(Predicate::Orientation2D, {{{a[k], a[(k + 1) % 3]}, {b[k], b[(k + 1) % 3]}, {c[k], c[(k + 1) % 3]}}}))
      return false;
  return true;
}

inline std::string Hex(double v)
{
  std::ostringstream s;
  s << std::hexfloat << v;
  return s.str();
}

// The points a predicate reads, in hex floats that reproduce them exactly.
inline std::string Format(Predicate p, const Case &c)
{
  std::string s = Name(p);
  for (int i = 0; i < PointCount(p); ++i)
    s += "(" + Hex(c[i][0]) + ", " + Hex(c[i][1]) + (Dimension(p) == 3 ? ", " + Hex(c[i][2]) : "") + ")";
  return s;
}
} // namespace exactref
