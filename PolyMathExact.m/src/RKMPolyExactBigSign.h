#pragma once

#include <array>
#include <cmath>
#include <cstdint>

// Exact signs of the orientation and in-circle determinants by integer arithmetic, for inputs whose
// magnitudes put the expansion arithmetic out of its range: products that overflow, or error terms
// that fall below the smallest subnormal and are lost. Every double of the input is an integer
// times 2^e; scaled by the smallest exponent present they all become integers of at most 2100 bits,
// and the determinants are polynomials of degree at most four in them. Slow, and only for those
// inputs. A coordinate that is not finite gives 0.
class RKMPolyExactBigSign
{
public:
  /// Sign of (a − c) × (b − c) over x, y pairs: +1 counter-clockwise.
  static int Orient2D(const double *a, const double *b, const double *c);
  /// Sign of ((b − a) × (c − a)) · (d − a).
  static int Orient3D(const double *a, const double *b, const double *c, const double *d);
  /// Sign of the lifted determinant relative to d: positive when d is inside the circle through a,
  /// b, c given counter-clockwise.
  static int InCircle(const double *a, const double *b, const double *c, const double *d);

  /// True when every non-zero value lies in [2^-150, 2^150]: then every difference, every product of
  /// up to four of them and every rounding error of those products is a double with no overflow and
  /// no loss to the subnormal range, which the expansion arithmetic needs to be exact.
  static bool InSafeRange(const double *v, int n)
  {
    // Without early exits: the answer is nearly always yes, and this way costs no branch.
    bool ok = true;
    for (int i = 0; i < n; ++i)
    {
      const double m = std::fabs(v[i]);
      ok &= (m == 0.0) | ((m >= 0x1p-150) & (m <= 0x1p150));
    }
    return ok;
  }

  /// Copies n values into out scaled by one power of two that brings every non-zero one into
  /// [2^-150, 2^150]; the scaling is exact there and leaves every sign of the homogeneous
  /// determinants unchanged. False when their magnitudes spread too far for that (or one is not
  /// finite): the integer path must decide.
  static bool ScaleIntoSafeRange(const double *const *v, int n, double *out)
  {
    int emin = 1 << 20, emax = -(1 << 20);
    for (int i = 0; i < n; ++i)
    {
      const double x = *v[i];
      if (!std::isfinite(x))
        return false;
      if (x == 0.0)
        continue;
      const int e = std::ilogb(x);
      emin = e < emin ? e : emin;
      emax = e > emax ? e : emax;
    }
    // |x| lies in [2^e, 2^(e + 1)); centre the window.
    const int k = -(emin + emax) / 2;
    if (emin > emax || emin + k < -150 || emax + 1 + k > 150)
      return false;
    for (int i = 0; i < n; ++i)
      out[i] = std::scalbn(*v[i], k);
    return true;
  }
};
