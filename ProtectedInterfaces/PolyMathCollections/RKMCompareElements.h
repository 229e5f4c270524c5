#pragma once

#include "RKMExport.h"

/// Comparison and hash of the elements a hash table stores, passed as untyped addresses.
/// Hash must agree with Compare: elements that compare equal hash alike.
class RKM_EXPORT RKMCompareElements
{
public:
  virtual ~RKMCompareElements();
  /// 0 when the two elements are equal.
  virtual int Compare(const void *a, const void *b) const = 0;
  virtual unsigned int Hash(const void *element) const = 0;
};
