#pragma once

#include "RKMExport.h"
#include "RKMMathPoint.h"
#include "RKMPolyBoundingVolume.h"

class RKMMathTransformation;

/// A slab {p : |normal·(p − origin)| ≤ thickness}, or all of space when infinitely thick.
class RKM_EXPORT RKMPolyBoundingPlane : public RKMPolyBoundingVolume
{
public:
  /// Normal (0, 0, 1), origin (0, 0, 0), thickness 0.01, not infinitely thick.
  RKMPolyBoundingPlane() = default;
  /// The normal is normalised, the thickness stored as its absolute value.
  RKMPolyBoundingPlane(const RKMMathVector &normal, const RKMMathPoint &origin, double thickness);

  HRESULT Accept(RKMPolyBVConstVisitor &visitor) const override;
  TypeID GetTypeID() const override { return TypePlane; }

  void SetNormal(const RKMMathVector &normal);
  void SetOrigin(const RKMMathPoint &origin) { m_origin = origin; }
  /// Stores |thickness|.
  void SetThickness(double thickness);
  void SetInfinitelyThick(unsigned char infinitelyThick) { m_infinitelyThick = infinitelyThick ? 1 : 0; }
  const RKMMathVector &GetNormal() const { return m_normal; }
  const RKMMathPoint &GetOrigin() const { return m_origin; }
  double GetThickness() const { return m_thickness; }
  unsigned char IsInfinitelyThick() const { return m_infinitelyThick; }

  /// thickness += d, never below 0.
  void Inflate(double d);
  /// The middle plane a·x + b·y + c·z + d = 0: (a, b, c) the normal, d = −normal·origin.
  void GetEquation(double &a, double &b, double &c, double &d) const;
  /// Distance from p to the slab, 0 inside; 0 everywhere when infinitely thick.
  double DistanceTo(const RKMMathPoint &p) const;
  double SquareDistanceTo(const RKMMathPoint &p) const;

private:
  RKMMathVector m_normal{0.0, 0.0, 1.0};
  RKMMathPoint m_origin;
  double m_thickness = 0.01;
  unsigned char m_infinitelyThick = 0;
};

/// The slab placed by T: it holds the image of every point of the slab, whatever T (a similitude
/// scales the thickness; a singular T gives an infinitely thick slab).
RKM_EXPORT RKMPolyBoundingPlane operator*(const RKMMathTransformation &T, const RKMPolyBoundingPlane &plane);
