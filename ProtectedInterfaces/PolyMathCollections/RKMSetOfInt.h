#pragma once

#include "RKMHTableTyped.h"

/// Set of ints; no allocation up to 31 elements.
class RKMSetOfInt : public RKMTypedSet<int, RKMHTableDetail::FixedD<&RKMHashIntWord>>
{
public:
  using RKMTypedSet<int, RKMHTableDetail::FixedD<&RKMHashIntWord>>::RKMTypedSet;
  /// The hash of an element: the value itself.
  static unsigned int HashKey(int v) { return static_cast<unsigned int>(v); }
};
