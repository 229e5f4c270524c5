#pragma once

#include "RKMHTableTyped.h"
#include "RKMCompareFloatPoints.h"

/// Set of the caller's float triples, by address: the caller keeps each triple alive and unchanged while it is in
/// the set. Triples are compared by value (RKMCompareFloatPoints unless the caller gives a comparison object).
class RKMSetOf3Floats : public RKMTypedSet<const float *, RKMHTableDetail::GenericD>
{
public:
  /// The comparison object is not owned and must outlive the set.
  explicit RKMSetOf3Floats(int size = 0, const RKMCompareElements *cmp = nullptr)
      : RKMTypedSet(size, RKMHTableDetail::GenericD{cmp ? cmp : &RKMCompareFloatPoints::Shared(), nullptr})
  {
  }
};
