#pragma once

#include "RKMBVHAttribute.h"
#include "RKMExport.h"

class RKMCellId;

/// Attribute tying a node to geometry of the caller's model; this base answers "nothing".
class RKM_EXPORT RKMGeomBVHAttribute : public RKMBVHAttribute
{
public:
  RKMGeomBVHAttribute *CastAsGeomAttribute() override { return this; }
  const RKMGeomBVHAttribute *CastAsGeomAttribute() const override { return this; }
  virtual unsigned char HasBody() const { return 0; }
  virtual unsigned char HasEdge() const { return 0; }
  virtual unsigned char HasFace() const { return 0; }
  virtual unsigned char HasPoints() const { return 0; }
  /// −1 here.
  virtual int GetBodyDimension() const { return -1; }
  /// The caller's cell; null here.
  virtual RKMCellId *GetId() const { return nullptr; }
};
