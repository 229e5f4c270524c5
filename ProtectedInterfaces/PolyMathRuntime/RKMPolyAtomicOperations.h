#pragma once

#include "RKMExport.h"

/// Atomic operations on int words, with full barriers.
class RKM_EXPORT RKMPolyAtomicOperations
{
public:
  /// Gives the new value.
  static int Increment(int *p);
  /// Gives the new value.
  static int Decrement(int *p);
  /// Stores exchange when *target equals comparand; gives the value before.
  static int CompareAndSwap(int *target, int exchange, int comparand);
  /// *p |= bits; gives the value before.
  static int BitWiseOr(int *p, int bits);
  /// *p &= ~bits; gives the whole value before.
  static int BitWiseTestAndReset(int *p, int bits);
};
