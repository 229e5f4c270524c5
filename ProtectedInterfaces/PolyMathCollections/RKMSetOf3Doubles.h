#pragma once

#include "RKMHTableTyped.h"
#include "RKMCompareDoublePoints.h"

/// Set of the caller's double triples, by address: the caller keeps each triple alive and unchanged while it is in
/// the set. Triples are compared by value (RKMCompareDoublePoints unless the caller gives a comparison object).
class RKMSetOf3Doubles : public RKMTypedSet<const double *, RKMHTableDetail::GenericD>
{
public:
  /// The comparison object is not owned and must outlive the set.
  explicit RKMSetOf3Doubles(int size = 0, const RKMCompareElements *cmp = nullptr)
      : RKMTypedSet(size, RKMHTableDetail::GenericD{cmp ? cmp : &RKMCompareDoublePoints::Shared(), nullptr})
  {
  }
};
