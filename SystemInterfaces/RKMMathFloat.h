#pragma once

#include <cfloat>
#include <cmath>

/// A double rounded to the nearest float, as the hardware conversion does. Beyond the float range,
/// where the language leaves the conversion undefined, the overflow is spelled out: FLT_MAX plus half
/// an ulp (2^103) is where rounding reaches infinity. NaN passes through.
inline float RKMRoundToFloat(double d)
{
  constexpr double kOverflow = 0x1.ffffffp+127;
  if (d > FLT_MAX)
    return d < kOverflow ? FLT_MAX : HUGE_VALF;
  if (d < -FLT_MAX)
    return d > -kOverflow ? -FLT_MAX : -HUGE_VALF;
  return static_cast<float>(d);
}

#include <cstdint>
#include <cstring>

/// The bit pattern of a float with −0 folded to +0 and every NaN to one quiet NaN, for hashes that
/// must agree with comparisons that find the two zeros equal, and all NaNs equal.
inline std::uint32_t RKMFoldedFloatBits(float f)
{
  if (f == 0.0f)
    f = 0.0f;
  if (f != f)
    return 0x7FC00000u;
  std::uint32_t i;
  std::memcpy(&i, &f, sizeof i);
  return i;
}
