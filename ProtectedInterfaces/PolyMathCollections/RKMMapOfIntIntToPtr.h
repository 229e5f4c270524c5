#pragma once

#include "RKMHTableTyped.h"

/// Map of ordered pairs of ints to pointer values, hashed by the sum of the keys; no allocation up to 31 entries.
class RKMMapOfIntIntToPtr : public RKMTypedMap2<int, void *, RKMHTableDetail::FixedKK<&RKMHashIntSum>>
{
public:
  using RKMTypedMap2<int, void *, RKMHTableDetail::FixedKK<&RKMHashIntSum>>::RKMTypedMap2;
  /// The hash of a key pair: k1 + k2, modulo 2^32.
  static unsigned int HashKey(int k1, int k2) { return static_cast<unsigned int>(k1) + static_cast<unsigned int>(k2); }
  /// Equality of two key pairs: 0 when both keys are equal.
  static int Compare(int a1, int a2, int b1, int b2) { return (a1 == b1 && a2 == b2) ? 0 : 1; }
};
