#pragma once

#include "RKMExport.h"
#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMSysTypes.h"

class RKMMathTransformation;

/// An oriented box: a centre, three orthonormal axes U, V, W and the half-sizes along them (the
/// diagonal). Undefined (holding nothing) when a half-size is negative (or NaN), as when built by
/// default or from an empty box. Every answer errs on the safe side of rounding: containment and
/// overlap are never missed, minimum distances are never overstated, maximum distances never
/// understated, and the boxes it builds enclose what they must.
class RKM_EXPORT RKMMathOBBBase
{
public:
  /// Undefined.
  RKMMathOBBBase();
  /// The box on the world axes; undefined for an empty box.
  explicit RKMMathOBBBase(const RKMMathBox &box);
  /// Axes (taken as orthonormal), half-sizes and centre.
  RKMMathOBBBase(const RKMMathVector axes[3], const RKMMathVector &halfSizes, const RKMMathPoint &center);

  unsigned char IsDefined() const { return m_half.x >= 0.0 && m_half.y >= 0.0 && m_half.z >= 0.0; }
  const RKMMathVector &U() const { return m_axes[0]; }
  const RKMMathVector &V() const { return m_axes[1]; }
  const RKMMathVector &W() const { return m_axes[2]; }
  const RKMMathVector &Axis(int i) const { return m_axes[i]; }
  const RKMMathPoint &Center() const { return m_center; }
  /// The half-sizes along U, V, W.
  const RKMMathVector &Diagonal() const { return m_half; }

  /// 1 when p lies in the box grown by tolerance on every side; 0 otherwise and when undefined.
  unsigned char IsContaining(const RKMMathPoint &p, double tolerance = 0.0) const;
  /// Non-zero unless one of the 15 separating axes separates the boxes by more than rounding can
  /// explain; 0 when either box is undefined.
  unsigned char IsIntersecting(const RKMMathOBBBase &other) const;
  /// Adds d to every half-size; a box shrunk below zero becomes undefined. Nothing when undefined.
  void Inflate(double d);

  /// Squared distance from p, 0 inside; RKMdoubleMax when undefined.
  double SquareDistanceTo(const RKMMathPoint &p) const;
  /// A lower bound of the squared distance between the boxes (the largest separating-axis gap), 0 when
  /// they may meet; RKMdoubleMax when either is undefined.
  double SquareDistanceTo(const RKMMathOBBBase &other) const;
  /// Squared distance from p to the farthest point of the box; −1 when undefined.
  double MaxSquareDistanceTo(const RKMMathPoint &p) const;
  /// Squared distance between the farthest pair of points of the boxes; −1 when either is undefined.
  double MaxSquareDistanceTo(const RKMMathOBBBase &other) const;

  /// Local (u, v, w) coordinates, relative to the centre along the axes, to world.
  RKMMathPoint UVWtoXYZ(const RKMMathPoint &uvw) const;
  /// World to local (u, v, w) coordinates.
  RKMMathPoint XYZtoUVW(const RKMMathPoint &xyz) const;
  /// The axis-aligned box enclosing this one; empty when undefined.
  void GetBox(RKMMathBox &box) const;
  /// The box centred at the origin with the half-sizes, and the rigid placement T of it (axes as the
  /// columns of T's matrix, the centre as its translation). E_FAIL with an empty box and the identity
  /// when undefined.
  HRESULT ConvertToBoxAndTransformation(RKMMathBox &box, RKMMathTransformation &T) const;
  /// Grows, keeping its axes, to contain the other box as well. S_FALSE when it did already (or the
  /// other is undefined); an undefined box takes the other.
  HRESULT Absorb(const RKMMathOBBBase &other);

  /// The eight corners (only when defined).
  void GetCorners(RKMMathPoint corners[8]) const;

private:
  RKMMathVector m_axes[3];
  RKMMathVector m_half;
  RKMMathPoint m_center;
};

/// An oriented box of the math layer.
class RKM_EXPORT RKMMathOBB : public RKMMathOBBBase
{
public:
  using RKMMathOBBBase::RKMMathOBBBase;
  RKMMathOBB() = default;
  RKMMathOBB(const RKMMathOBBBase &base) : RKMMathOBBBase(base) {}
};

/// The image of the box under T, or a box enclosing it when T is not rigid (scaling and shear
/// included); undefined for an undefined box.
RKM_EXPORT RKMMathOBBBase operator*(const RKMMathTransformation &T, const RKMMathOBBBase &box);
