#pragma once

#include "RKMCompareElements.h"
#include "RKMExport.h"

/// Elements are addresses of three floats (x, y, z).
class RKM_EXPORT RKMCompareFloatPoints : public RKMCompareElements
{
public:
  /// Lexicographic by x, then y, then z: −1, 0 or 1; a NaN coordinate comes after every number and
  /// equals another NaN. A null element compares as 0 (equal).
  int Compare(const void *a, const void *b) const override;
  unsigned int Hash(const void *element) const override;

  /// A process-wide instance, shared by the sets that are given no comparison object.
  static const RKMCompareFloatPoints &Shared();

  /// As Compare.
  static int CompareLexicographic(const float *a, const float *b);
  /// Sum, modulo 2^32, of the bit patterns of the three coordinates; −0 counts as +0 and every NaN as one.
  static unsigned int HashThreeFloats(const float *xyz);
};

/// The hash of float triples used by the sets of float points.
class RKM_EXPORT RKMHashFloatPoint
{
public:
  /// The same value as RKMCompareFloatPoints::HashThreeFloats.
  static unsigned int Hash(const float *xyz);
};
