#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathBox;
class RKMMathPoint;
class RKMMathPointf;

/// Axis-aligned box stored in single precision that always encloses the double geometry put into it:
/// a double entering the box is rounded to float and then moved one float step outward. Float
/// inputs enter unchanged. Empty when xmin > xmax; the canonical empty box is (1, 1, 1, −1, −1, −1).
/// A NaN entering as a bound or a coordinate leaves that side unbounded (±inf), and an infinite bound
/// stays infinite, so no geometry is ever lost and overlap tests never miss.
class RKM_EXPORT RKMPolyBoxf
{
public:
  /// The order in which UltraFastIsIntersecting tests the axes.
  enum IntersectionTestOrder
  {
    OrderXYZ = 0,
    OrderXZY = 1,
    OrderYXZ = 2,
    OrderYZX = 3,
    OrderZXY = 4,
    OrderZYX = 5
  };

  /// The canonical empty box.
  RKMPolyBoxf() { SetToEmpty(); }
  /// Copies the six values, or gives the canonical empty box for an empty source.
  RKMPolyBoxf(const RKMPolyBoxf &other);
  RKMPolyBoxf &operator=(const RKMPolyBoxf &other) = default;
  /// Stores the float bounds as given (order xmin, xmax, ymin, ymax, zmin, zmax), without rounding.
  RKMPolyBoxf(float xmin, float xmax, float ymin, float ymax, float zmin, float zmax);
  /// Rounds each double bound to float and steps it outward (order xmin, xmax, ymin, ymax, zmin, zmax).
  /// Inverted bounds are stepped all the same, so they give an empty box unless the inversion is
  /// within the steps.
  RKMPolyBoxf(double xmin, double xmax, double ymin, double ymax, double zmin, double zmax);
  /// The box enclosing a math box, bounds stepped outward; empty for an empty math box.
  explicit RKMPolyBoxf(const RKMMathBox &box);

  void SetToEmpty();
  /// As the float constructor: the values are stored without rounding.
  void SetExtremities(float xmin, float xmax, float ymin, float ymax, float zmin, float zmax);
  /// As the math box constructor.
  void SetBox(const RKMMathBox &box);

  /// Grows to hold another float box; no rounding.
  void AddInside(const RKMPolyBoxf &other);
  /// Grows to hold a math box; only the bounds that move are stepped outward.
  void AddInside(const RKMMathBox &box);
  /// Grows to hold a point; only the bounds that move are stepped outward, so an empty box
  /// becomes a small box of positive extent around the point.
  void AddInside(const RKMMathPoint &p);
  /// Grows to hold a float point exactly; an empty box becomes that single point.
  void AddInside(const RKMMathPointf &p);
  /// The union of a and b; on equal bounds those of a are kept.
  void SetToUnion(const RKMPolyBoxf &a, const RKMPolyBoxf &b);
  /// Moves every bound outward by d (computed in double), then rounds and steps it outward like any
  /// double bound. A negative d shrinks the box and may empty it. Nothing when empty.
  void Inflate(double d);

  unsigned char IsEmpty() const { return m_min[0] > m_max[0]; }
  float GetXMin() const { return m_min[0]; }
  float GetYMin() const { return m_min[1]; }
  float GetZMin() const { return m_min[2]; }
  float GetXMax() const { return m_max[0]; }
  float GetYMax() const { return m_max[1]; }
  float GetZMax() const { return m_max[2]; }
  /// E_FAIL with the outputs untouched when empty, else S_OK.
  HRESULT GetLimits(float &xmin, float &xmax, float &ymin, float &ymax, float &zmin, float &zmax) const;
  /// E_FAIL with the outputs untouched when empty, else S_OK.
  HRESULT GetLimits(double &xmin, double &xmax, double &ymin, double &ymax, double &zmin, double &zmax) const;
  /// E_FAIL when empty, else S_OK with (xmin, ymin, zmin).
  HRESULT GetLowLimit(RKMMathPoint &p) const;
  /// E_FAIL when empty, else S_OK with (xmax, ymax, zmax).
  HRESULT GetHighLimit(RKMMathPoint &p) const;
  /// The same box in doubles (exactly); an empty math box when empty.
  RKMMathBox GetMathBox() const;
  /// Computed in double; 0 when empty.
  double Volume() const;
  /// Closed test in double; false when empty.
  unsigned char IsContaining(const RKMMathPoint &p) const;

  /// Closed overlap test in float with the tolerance added to the max sides; false when either box
  /// is empty.
  unsigned char IsIntersecting(const RKMPolyBoxf &other, float tolerance) const;
  /// Closed overlap test against a math box widened by the tolerance in double and rounded to float;
  /// false when either box is empty.
  unsigned char IsIntersecting(const RKMMathBox &box, double tolerance) const;
  /// Closed overlap test, axes x, y, z; does not look at emptiness.
  unsigned char FastIsIntersecting(const RKMPolyBoxf &other) const
  {
    return !(other.m_max[0] < m_min[0] || m_max[0] < other.m_min[0] ||
             other.m_max[1] < m_min[1] || m_max[1] < other.m_min[1] ||
             other.m_max[2] < m_min[2] || m_max[2] < other.m_min[2]);
  }
  /// As FastIsIntersecting with the tolerance added to the max sides.
  unsigned char FastIsIntersecting(const RKMPolyBoxf &other, float tolerance) const
  {
    return !(other.m_max[0] + tolerance < m_min[0] || m_max[0] + tolerance < other.m_min[0] ||
             other.m_max[1] + tolerance < m_min[1] || m_max[1] + tolerance < other.m_min[1] ||
             other.m_max[2] + tolerance < m_min[2] || m_max[2] + tolerance < other.m_min[2]);
  }
  /// The axes by increasing extent of this box, ties x before y before z.
  IntersectionTestOrder GetAxisTestOrder() const;
  /// As FastIsIntersecting, testing the axes in the given order (from GetAxisTestOrder of this box);
  /// false for an order outside 0…5.
  unsigned char UltraFastIsIntersecting(IntersectionTestOrder order, const RKMPolyBoxf &other) const
  {
    if (static_cast<unsigned>(order) > 5u)
      return 0;
    const unsigned char *axes = kAxisOrders[order];
    for (int k = 0; k < 3; ++k)
    {
      const int a = axes[k];
      if (other.m_max[a] < m_min[a] || m_max[a] < other.m_min[a])
        return 0;
    }
    return 1;
  }

private:
  static constexpr unsigned char kAxisOrders[6][3] = {{0, 1, 2}, {0, 2, 1}, {1, 0, 2},
                                                      {1, 2, 0}, {2, 0, 1}, {2, 1, 0}};
  float m_min[3];
  float m_max[3];
};
