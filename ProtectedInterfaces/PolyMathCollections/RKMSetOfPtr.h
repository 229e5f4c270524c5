#pragma once

#include "RKMHTableTyped.h"

/// Set of pointers, compared by the caller's comparison object when given, else by address.
class RKMSetOfPtr : public RKMTypedSet<void *, RKMHTableDetail::GenericD>
{
public:
  /// The comparison object is not owned and must outlive the set.
  explicit RKMSetOfPtr(int size = 0, const RKMCompareElements *cmp = nullptr)
      : RKMTypedSet(size, RKMHTableDetail::GenericD{cmp, nullptr})
  {
  }
};
