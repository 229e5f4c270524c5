#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMPolyBoundingVolume;
class RKMPolyBoundingCylinder;
class RKMPolyBoundingPlane;
class RKMPolyOBB;
class RKMPolyAABB;
class RKMPolyBoundingSphere;

/// Visitor of the concrete volume kinds (double dispatch through RKMPolyBoundingVolume::Accept).
class RKM_EXPORT RKMPolyBVConstVisitor
{
public:
  virtual ~RKMPolyBVConstVisitor();
  virtual HRESULT VisitConcrete(const RKMPolyBoundingCylinder &bv) = 0;
  virtual HRESULT VisitConcrete(const RKMPolyBoundingPlane &bv) = 0;
  virtual HRESULT VisitConcrete(const RKMPolyOBB &bv) = 0;
  virtual HRESULT VisitConcrete(const RKMPolyAABB &bv) = 0;
  virtual HRESULT VisitConcrete(const RKMPolyBoundingSphere &bv) = 0;

  /// bv.Accept(*this).
  HRESULT Visit(const RKMPolyBoundingVolume &bv);
};
