#pragma once

#include "RKMCompareElements.h"
#include "RKMExport.h"

/// Elements are addresses of three doubles (x, y, z).
class RKM_EXPORT RKMCompareDoublePoints : public RKMCompareElements
{
public:
  /// Lexicographic by x, then y, then z: −1, 0 or 1; a NaN coordinate comes after every number and
  /// equals another NaN. A null element compares as 0 (equal).
  int Compare(const void *a, const void *b) const override;
  unsigned int Hash(const void *element) const override;

  /// A process-wide instance, shared by the sets that are given no comparison object.
  static const RKMCompareDoublePoints &Shared();

  /// As Compare.
  static int CompareLexicographic(const double *a, const double *b);
  /// Sum, modulo 2^32, of the bit patterns of the three coordinates rounded to float; −0 counts as +0
  /// and every NaN as one, so that coordinates that compare equal hash alike.
  static unsigned int HashThreeDoubles(const double *xyz);
};
