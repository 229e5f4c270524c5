#include "RKMCompareDoublePoints.h"
#include "RKMCompareElements.h"
#include "RKMCompareFloatPoints.h"
#include "RKMMathFloat.h"


namespace
{
// A total order: NaN comes after every number and equals any NaN. Left to < and >, a NaN would
// equal every number while hashing apart from it.
template <class T>
int Order(T a, T b)
{
  const bool na = a != a, nb = b != b;
  if (na || nb)
    return na == nb ? 0 : (na ? 1 : -1);
  return a < b ? -1 : (a > b ? 1 : 0);
}

template <class T>
int Lexicographic(const T *a, const T *b)
{
  if (!a || !b)
    return 0;
  for (int i = 0; i < 3; ++i)
    if (const int o = Order(a[i], b[i]))
      return o;
  return 0;
}
}

RKMCompareElements::~RKMCompareElements() = default;

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

int RKMCompareDoublePoints::CompareLexicographic(const double *a, const double *b) { return Lexicographic(a, b); }

unsigned int RKMCompareDoublePoints::HashThreeDoubles(const double *xyz)
{
  if (!xyz)
    return 0;
  return RKMFoldedFloatBits(RKMRoundToFloat(xyz[0])) + RKMFoldedFloatBits(RKMRoundToFloat(xyz[1])) + RKMFoldedFloatBits(RKMRoundToFloat(xyz[2]));
}

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

int RKMCompareFloatPoints::CompareLexicographic(const float *a, const float *b) { return Lexicographic(a, b); }

unsigned int RKMCompareFloatPoints::HashThreeFloats(const float *xyz)
{
  if (!xyz)
    return 0;
  return RKMFoldedFloatBits(xyz[0]) + RKMFoldedFloatBits(xyz[1]) + RKMFoldedFloatBits(xyz[2]);
}

unsigned int RKMHashFloatPoint::Hash(const float *xyz) { return RKMCompareFloatPoints::HashThreeFloats(xyz); }
