#pragma once

#include "RKMExport.h"

class RKMGeomBVHAttribute;
class RKMBVHVisuAttribute;
class RKMBodyBVHAttribute;
class RKMPolyBVHAttribute;
class RKMTessBVHAttribute;

/// Base of the caller's data attached to a node, with an atomic flag word. The Cast operations name
/// the derived kinds that client libraries define; each gives null unless overridden.
class RKM_EXPORT RKMBVHAttribute
{
public:
  /// Bits of the flag word; their meanings belong to the callers.
  typedef int FlagType;

  RKMBVHAttribute() = default;
  RKMBVHAttribute(const RKMBVHAttribute &other);
  RKMBVHAttribute &operator=(const RKMBVHAttribute &other);
  virtual ~RKMBVHAttribute();

  virtual RKMGeomBVHAttribute *CastAsGeomAttribute();
  virtual const RKMGeomBVHAttribute *CastAsGeomAttribute() const;
  virtual RKMBVHVisuAttribute *CastAsVisuAttribute();
  virtual const RKMBVHVisuAttribute *CastAsVisuAttribute() const;
  virtual RKMBodyBVHAttribute *CastAsBodyAttribute();
  virtual const RKMBodyBVHAttribute *CastAsBodyAttribute() const;
  virtual RKMPolyBVHAttribute *CastAsPolyAttribute();
  virtual const RKMPolyBVHAttribute *CastAsPolyAttribute() const;
  virtual RKMTessBVHAttribute *CastAsTessAttribute();
  virtual const RKMTessBVHAttribute *CastAsTessAttribute() const;
  /// Drops data computed on demand; nothing in this base.
  virtual void FlushComputedData();

  /// Atomically sets the bits.
  void EnableFlag(FlagType bits);
  /// Atomically clears the bits.
  void DisableFlag(FlagType bits);
  /// True when any of the bits is set (read atomically).
  unsigned char TestFlag(FlagType bits) const;

private:
  mutable int m_flags = 0;
};
