#pragma once

#include "RKMExport.h"
#include "RKMMathOBBBase.h"
#include "RKMPolyBoundingVolume.h"

class RKMMathBox;
class RKMMathTransformation;
class RKMPolyBoxf;

/// Oriented bounding box over RKMMathOBBBase; undefined (empty) when a half-size is negative.
class RKM_EXPORT RKMPolyOBB : public RKMPolyBoundingVolume
{
public:
  enum OBBOverlap
  {
    OBBDisjoint = 0,
    OBBIntersecting = 1
  };

  /// Undefined.
  RKMPolyOBB() = default;
  explicit RKMPolyOBB(const RKMMathBox &box);
  explicit RKMPolyOBB(const RKMMathOBBBase &base) : m_base(base) {}
  /// An empty float box gives an undefined box.
  explicit RKMPolyOBB(const RKMPolyBoxf &box);
  RKMPolyOBB(const RKMMathVector axes[3], const RKMMathVector &halfSizes, const RKMMathPoint &center)
      : m_base(axes, halfSizes, center)
  {
  }

  HRESULT Accept(RKMPolyBVConstVisitor &visitor) const override;
  TypeID GetTypeID() const override { return TypeOBB; }

  RKMMathVector U() const { return m_base.U(); }
  RKMMathVector V() const { return m_base.V(); }
  RKMMathVector W() const { return m_base.W(); }
  RKMMathPoint Center() const { return m_base.Center(); }
  /// The half-sizes along U, V, W.
  RKMMathVector Diagonal() const { return m_base.Diagonal(); }
  RKMMathOBBBase &GetBase() { return m_base; }
  const RKMMathOBBBase &GetBase() const { return m_base; }
  unsigned char IsDefined() const { return m_base.IsDefined(); }

  RKMMathPoint UVWtoXYZ(const RKMMathPoint &p) const { return m_base.UVWtoXYZ(p); }
  RKMMathPoint XYZtoUVW(const RKMMathPoint &p) const { return m_base.XYZtoUVW(p); }
  unsigned char IsContaining(const RKMMathPoint &p) const { return m_base.IsContaining(p, 0.0) == 1; }
  /// The enclosing axis-aligned box; empty when undefined.
  RKMMathBox GetAABB() const;
  HRESULT ConvertToBoxAndTransformation(RKMMathBox &box, RKMMathTransformation &T) const;
  HRESULT Absorb(const RKMPolyOBB &other) { return m_base.Absorb(other.m_base); }
  void Inflate(double d) { m_base.Inflate(d); }
  double SquareDistanceMin(const RKMPolyOBB &other) const { return m_base.SquareDistanceTo(other.m_base); }
  double SquareDistanceMin(const RKMMathPoint &p) const { return m_base.SquareDistanceTo(p); }
  double SquareDistanceMax(const RKMPolyOBB &other) const { return m_base.MaxSquareDistanceTo(other.m_base); }
  double SquareDistanceMax(const RKMMathPoint &p) const { return m_base.MaxSquareDistanceTo(p); }
  /// Whether the other box, moved along the line of direction (either sense), meets this one; the
  /// smallest squared travel in squareDistance (0 when they overlap). A direction of squared length
  /// ≤ 1e-6 gives false with the output untouched; otherwise the output is 1e49 when they never meet.
  unsigned char SquareDistanceMinDir(const RKMPolyOBB &other, const RKMMathVector &direction,
                                     double &squareDistance) const;
  /// The same for a sphere (centre, radius) moved along the line of direction. An overlapping sphere
  /// gives true with 0 whatever the direction; a direction of squared length ≤ 1e-6 otherwise gives
  /// false with the output untouched.
  unsigned char SquareDistanceMinDir(const RKMMathPoint &center, double radius, const RKMMathVector &direction,
                                     double &squareDistance) const;
  OBBOverlap Test(const RKMPolyOBB &other) const
  {
    return m_base.IsIntersecting(other.m_base) ? OBBIntersecting : OBBDisjoint;
  }

private:
  RKMMathOBBBase m_base;
};
