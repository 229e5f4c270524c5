#pragma once

#include "RKMExport.h"
#include "RKMPolyBVConstVisitor.h"

/// Copies a volume of any kind into a new pool-allocated volume of the same kind.
class RKM_EXPORT RKMPolyBVClone : public RKMPolyBVConstVisitor
{
public:
  /// A new copy owned by the caller; null for a null volume or when the pool gives nothing.
  static RKMPolyBoundingVolume *Clone(const RKMPolyBoundingVolume *bv);

  ~RKMPolyBVClone() override;
  RKMPolyBVClone(const RKMPolyBVClone &) = default;
  RKMPolyBVClone &operator=(const RKMPolyBVClone &) = default;

  HRESULT VisitConcrete(const RKMPolyBoundingCylinder &bv) override;
  HRESULT VisitConcrete(const RKMPolyBoundingPlane &bv) override;
  HRESULT VisitConcrete(const RKMPolyOBB &bv) override;
  HRESULT VisitConcrete(const RKMPolyAABB &bv) override;
  HRESULT VisitConcrete(const RKMPolyBoundingSphere &bv) override;

  /// The copy made by the last visit (not owned by the visitor).
  RKMPolyBoundingVolume *clone = nullptr;

protected:
  RKMPolyBVClone() = default;
};
