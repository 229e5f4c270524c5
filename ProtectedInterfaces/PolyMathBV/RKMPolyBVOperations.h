#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMMathBox;
class RKMMathTransformation;
class RKMPolyBoundingVolume;

/// Operations on one volume of any kind: placement by a transformation, inflation, enclosing box.
/// A placed volume holds the image of every point of the source, whatever the transformation.
class RKM_EXPORT RKMPolyBVOperations
{
public:
  /// A new volume, owned by the caller, holding bv placed by T (a box placed by anything but the
  /// identity becomes an oriented box). E_NOTIMPL for an unknown kind, E_OUTOFMEMORY (result untouched)
  /// when the pool gives nothing.
  static HRESULT CreateTransformedInstance(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                           RKMPolyBoundingVolume *&result);
  /// Places bv by T in place; E_NOTIMPL for an unknown kind.
  static HRESULT Transform(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T);
  /// Grows bv by d in every direction; nothing unless d > 0 (a NaN d included).
  static HRESULT Inflate(RKMPolyBoundingVolume &bv, double d);
  /// The axis-aligned box enclosing bv. E_FAIL (box untouched) for a slab or an infinite cylinder,
  /// E_NOTIMPL for an unknown kind.
  static HRESULT GetEnclosingBox(const RKMPolyBoundingVolume &bv, RKMMathBox &box);
  /// The same for bv placed by T; a null T is the plain form.
  static HRESULT GetEnclosingBox(const RKMPolyBoundingVolume &bv, RKMMathBox &box, const RKMMathTransformation *T);

private:
  static HRESULT CreateAABBTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                              RKMPolyBoundingVolume *&result);
  static HRESULT CreateSphereTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                RKMPolyBoundingVolume *&result);
  static HRESULT CreateOBBTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                             RKMPolyBoundingVolume *&result);
  static HRESULT CreatePlaneTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                               RKMPolyBoundingVolume *&result);
  static HRESULT CreateCylinderTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                  RKMPolyBoundingVolume *&result);
  static HRESULT TransformAABB(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T);
  static HRESULT TransformSphere(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T);
  static HRESULT TransformOBB(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T);
  static HRESULT TransformPlane(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T);
  static HRESULT TransformCylinder(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T);
};
