#pragma once

#include <cstdint>

#include "RKMExport.h"
#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMSysTypes.h"

class RKMPolyAdaptivePredicates;

/// The coordinate grid and exact sign tests for one set of data. In the Gridded mode coordinates are
/// snapped to multiples of 2ε inside [-P, P], P the smallest power of two not below the announced
/// maximum and ε = P·2^-23, so that every grid coordinate has at most 24 significant bits and the
/// orientation tests are exact on them. In the Adaptive modes coordinates are left as they are and
/// the signs come from adaptive expansion arithmetic, exact for any finite double. Read-only after
/// SetMaxCoord: one configured instance may serve several threads.
class RKM_EXPORT RKMPolyExactArithmetic
{
public:
  /// Any other stored value makes the orientation tests answer 0 and snapping do nothing.
  enum Mode : std::int32_t
  {
    Gridded = 0,
    Adaptive = 1,
    /// Behaves exactly as Adaptive.
    Adaptive2 = 2
  };

  /// Sets the maximum coordinate to 100000 (P = 131072, ε = 2^-6).
  explicit RKMPolyExactArithmetic(Mode mode = Gridded);
  ~RKMPolyExactArithmetic();
  RKMPolyExactArithmetic(const RKMPolyExactArithmetic &) = delete;
  RKMPolyExactArithmetic &operator=(const RKMPolyExactArithmetic &) = delete;

  /// Stores M and derives the grid from it. S_OK for a positive finite M up to 2^127. Any other value
  /// still gets a usable grid and E_INVALIDARG: |M| for a negative M, the finest float grid
  /// (P = 2^-126) for 0, the coarsest (P = 2^127) for NaN, an infinity or M above 2^127.
  HRESULT SetMaxCoord(float M);
  /// M as given to SetMaxCoord, even when it was not usable as such.
  float GetMaxCoord() const { return m_maxCoord; }
  /// ε: half the grid step.
  double GetCoordinatePrecision() const { return m_precision; }
  Mode GetMode() const { return m_mode; }
  /// 0 when memory ran out while the arithmetic was made: it then has no adaptive kernel, and every
  /// sign that needs one (the Adaptive modes, InCircle) is 0. A caller that cannot tell such a 0 from
  /// a degenerate case asks here first.
  unsigned char IsValid() const { return m_kernel != nullptr; }
  /// M snapped in the Gridded mode, M itself otherwise.
  float GetMaxNormalizedCoord() const;

  /// Snap to the nearest grid coordinate in the Gridded mode; no change in any other mode. A value
  /// beyond ±P becomes RKMMathInfinite as a float. A double is rounded to float first.
  void Normalize(float &v) const;
  void Normalize(double &v) const;
  void Normalize(RKMMathPoint2D &p) const;
  void Normalize(RKMMathPoint &p) const;
  /// The snap of Normalize(float&) whatever the mode.
  void Grid(float &v) const;
  /// 1 when the three values lie in [-P, P], bounds included; 0 otherwise (NaN included).
  int IsPointInMAX23Range(float x, float y, float z) const;

  /// -1, 0 or 1; 0 also when either is NaN.
  int Compare(double a, double b) const;
  /// 1 when every coordinate pair compares equal; a NaN makes it 0.
  int Equal(double a, double b) const;
  int Equal(const RKMMathPoint2D &a, const RKMMathPoint2D &b) const;
  int Equal(const RKMMathPoint &a, const RKMMathPoint &b) const;
  int CompareBelowAbove(const RKMMathPoint2D &a, const RKMMathPoint2D &b) const;
  int CompareLeftRight(const RKMMathPoint2D &a, const RKMMathPoint2D &b) const;

  /// +1 when a, b, c run counter-clockwise, -1 clockwise, 0 collinear. Exact on grid coordinates in
  /// the Gridded mode, on any finite doubles in the Adaptive modes.
  int Orientation2D(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c) const
  {
    return Orientation2D(&a.x, &b.x, &c.x);
  }
  /// Each pointer addresses an x, y pair.
  int Orientation2D(const double *a, const double *b, const double *c) const;
  /// The sign of ((b − a) × (c − a)) · (d − a): +1 when d lies on the side the normal of a, b, c
  /// points to. Exact as Orientation2D.
  int Orientation3D(const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c,
                    const RKMMathPoint &d) const
  {
    return Orientation3D(&a.x, &b.x, &c.x, &d.x);
  }
  /// Each pointer addresses an x, y, z triple.
  int Orientation3D(const double *a, const double *b, const double *c, const double *d) const;
  /// +1 when d lies strictly inside the circle through a, b, c, -1 outside, 0 on it, whatever the
  /// orientation of a, b, c; always through the adaptive kernel, so exact in every mode.
  int InCircle(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
               const RKMMathPoint2D &d) const;

private:
  /// The differences of b, c and d from a and the 2×2 minors of the 3D orientation determinant,
  /// which its filters and its exact stage share. On grid coordinates the differences take 24 bits
  /// and the minors 49, so both are exact however the caller's code is compiled.
  struct Minors3D
  {
    Minors3D(const double *a, const double *b, const double *c, const double *d)
    {
      const double By = b[1] - a[1], Bz = b[2] - a[2];
      const double Cy = c[1] - a[1], Cz = c[2] - a[2];
      const double Dy = d[1] - a[1], Dz = d[2] - a[2];
      Bx = b[0] - a[0];
      Cx = c[0] - a[0];
      Dx = d[0] - a[0];
      m1 = Dz * Cy - Dy * Cz;
      m2 = Dz * By - Dy * Bz;
      m3 = Cz * By - Cy * Bz;
    }
    double Bx, Cx, Dx;
    double m1, m2, m3;
  };

  int GriddedOrientation2D(const double *a, const double *b, const double *c) const;
  /// The stages after the static filter of the gridded 3D test.
  int GriddedOrientation3D(const double *a, const double *b, const double *c, const double *d) const;
  int AdaptiveOrientation2D(const double *a, const double *b, const double *c) const;
  int AdaptiveOrientation3D(const double *a, const double *b, const double *c, const double *d) const;
  /// The exact stage of the gridded 3D test alone.
  int ExactOrientation3D(const Minors3D &m) const;
  void Split(double a, double &high, double &low, const double &S) const;
  float Snap(float v) const;

  double m_precision = 0.0;
  double m_rangeBound = 0.0;
  double m_snapConstant = 0.0;
  double m_splitConstant = 0.0;
  double m_staticFilter3 = 0.0;
  double m_relativeError = 0.0;
  double m_filterFloor = 0.0;
  double m_splitConstant2D = 0.0;
  Mode m_mode;
  float m_maxCoord = -1.0f;
  RKMPolyAdaptivePredicates *m_kernel = nullptr;
};

/// Lexicographic comparisons, -1 / 0 / 1; NaN coordinates count as equal, so these are not strict
/// weak orders when NaNs are present. BelowAbove orders by y then x (2D), or z, y, x (3D).
RKM_EXPORT int RKMPolyCompareBelowAbove(const RKMMathPoint2D &a, const RKMMathPoint2D &b);
RKM_EXPORT int RKMPolyCompareBelowAbove(const RKMMathPoint &a, const RKMMathPoint &b);
/// Orders by x then y (2D), or x, y, z (3D).
RKM_EXPORT int RKMPolyCompareLeftRight(const RKMMathPoint2D &a, const RKMMathPoint2D &b);
RKM_EXPORT int RKMPolyCompareLeftRight(const RKMMathPoint &a, const RKMMathPoint &b);

inline int RKMPolyExactArithmetic::Orientation2D(const double *a, const double *b, const double *c) const
{
  if (m_mode == Gridded)
  {
    // On grid coordinates the differences take 24 bits and their products 48, so det is exact; the
    // exact stage only settles what the absolute threshold leaves open.
    const double det = (a[0] - c[0]) * (b[1] - c[1]) - (b[0] - c[0]) * (a[1] - c[1]);
    // Computed without branching on the sign, which is unpredictable; only the rare fall-through
    // to the exact stage branches.
    const int s = (det > 1e-15) - (det < -1e-15);
    if (__builtin_expect(s != 0, 1))
      return s;
    return GriddedOrientation2D(a, b, c);
  }
  return AdaptiveOrientation2D(a, b, c);
}

inline int RKMPolyExactArithmetic::Orientation3D(const double *a, const double *b, const double *c,
                                                 const double *d) const
{
  if (m_mode == Gridded)
  {
    // Static filter: on grid coordinates the rounding error of det stays below 1.125·2^23·ε³, a
    // quarter of the bound, with or without fused multiply-adds (they only remove roundings).
    const Minors3D m(a, b, c, d);
    const double det = (m.m1 * m.Bx - m.m2 * m.Cx) + m.m3 * m.Dx;
    const int s = (det > m_staticFilter3) - (det < -m_staticFilter3);
    if (__builtin_expect(s != 0, 1))
      return s;
    return GriddedOrientation3D(a, b, c, d);
  }
  return AdaptiveOrientation3D(a, b, c, d);
}
