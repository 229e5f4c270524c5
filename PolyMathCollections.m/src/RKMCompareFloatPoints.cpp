// RKMCompareFloatPoints and RKMHashFloatPoint, which lends its hash to the float point sets: both are
// declared in RKMCompareFloatPoints.h.
#include "RKMCompareFloatPoints.h"
#include "RKMLexicographicOrder.h"

#include "RKMMathFloat.h"

int RKMCompareFloatPoints::Compare(const void *a, const void *b) const
{
  return CompareLexicographic(static_cast<const float *>(a), static_cast<const float *>(b));
}

unsigned int RKMCompareFloatPoints::Hash(const void *element) const
{
  return HashThreeFloats(static_cast<const float *>(element));
}

const RKMCompareFloatPoints &RKMCompareFloatPoints::Shared()
{
  static const RKMCompareFloatPoints shared;
  return shared;
}

int RKMCompareFloatPoints::CompareLexicographic(const float *a, const float *b)
{
  return RKMLexicographicOrder::Lexicographic(a, b);
}

unsigned int RKMCompareFloatPoints::HashThreeFloats(const float *xyz)
{
  if (!xyz)
    return 0;
  return RKMFoldedFloatBits(xyz[0]) + RKMFoldedFloatBits(xyz[1]) + RKMFoldedFloatBits(xyz[2]);
}

unsigned int RKMHashFloatPoint::Hash(const float *xyz) { return RKMCompareFloatPoints::HashThreeFloats(xyz); }
