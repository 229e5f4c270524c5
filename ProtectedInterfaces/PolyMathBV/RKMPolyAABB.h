#pragma once

#include "RKMExport.h"
#include "RKMPolyBoundingVolume.h"
#include "RKMPolyBoxf.h"

class RKMMathBox;

/// Axis-aligned bounding box in single precision, enclosing the double geometry it was made from.
class RKM_EXPORT RKMPolyAABB : public RKMPolyBoundingVolume
{
public:
  /// The canonical empty box.
  RKMPolyAABB() = default;
  /// Copies the bounds; every empty source gives the canonical empty box.
  RKMPolyAABB(const RKMPolyAABB &other);
  /// Copies the bounds; every empty source gives the canonical empty box.
  explicit RKMPolyAABB(const RKMPolyBoxf &box);
  /// Rounds the math box outward.
  explicit RKMPolyAABB(const RKMMathBox &box);
  /// Copies the six values verbatim.
  RKMPolyAABB &operator=(const RKMPolyAABB &other) = default;

  HRESULT Accept(RKMPolyBVConstVisitor &visitor) const override;
  TypeID GetTypeID() const override { return TypeAABB; }

  const RKMPolyBoxf &GetBoxf() const { return m_box; }
  /// Copies the six values verbatim, empty or not.
  void SetBoxf(const RKMPolyBoxf &box) { m_box = box; }
  /// Rounds outward; an empty math box gives the canonical empty box.
  void SetMathBox(const RKMMathBox &box);
  /// Two empty boxes are equal; otherwise all six bounds must compare equal.
  unsigned char operator==(const RKMPolyAABB &other) const;

private:
  RKMPolyBoxf m_box;
};
