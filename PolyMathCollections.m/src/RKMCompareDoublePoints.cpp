#include "RKMCompareDoublePoints.h"
#include "RKMLexicographicOrder.h"

#include "RKMMathFloat.h"

int RKMCompareDoublePoints::Compare(const void *a, const void *b) const
{
  return CompareLexicographic(static_cast<const double *>(a), static_cast<const double *>(b));
}

unsigned int RKMCompareDoublePoints::Hash(const void *element) const
{
  return HashThreeDoubles(static_cast<const double *>(element));
}

const RKMCompareDoublePoints &RKMCompareDoublePoints::Shared()
{
  static const RKMCompareDoublePoints shared;
  return shared;
}

int RKMCompareDoublePoints::CompareLexicographic(const double *a, const double *b)
{
  return RKMLexicographicOrder::Lexicographic(a, b);
}

unsigned int RKMCompareDoublePoints::HashThreeDoubles(const double *xyz)
{
  if (!xyz)
    return 0;
  return RKMFoldedFloatBits(RKMRoundToFloat(xyz[0])) + RKMFoldedFloatBits(RKMRoundToFloat(xyz[1])) +
         RKMFoldedFloatBits(RKMRoundToFloat(xyz[2]));
}
