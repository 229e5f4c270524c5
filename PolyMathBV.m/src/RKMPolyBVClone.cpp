#include "RKMPolyAABB.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

RKMPolyBoundingVolume *RKMPolyBVClone::Clone(const RKMPolyBoundingVolume *bv)
{
  if (!bv)
    return nullptr;
  RKMPolyBVClone visitor;
  visitor.Visit(*bv);
  return visitor.clone;
}

RKMPolyBVClone::~RKMPolyBVClone() { clone = nullptr; }

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyBoundingCylinder &bv)
{
  clone = new RKMPolyBoundingCylinder(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyBoundingPlane &bv)
{
  clone = new RKMPolyBoundingPlane(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyOBB &bv)
{
  clone = new RKMPolyOBB(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyAABB &bv)
{
  clone = new RKMPolyAABB(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyBoundingSphere &bv)
{
  clone = new RKMPolyBoundingSphere(bv);
  return S_OK;
}
