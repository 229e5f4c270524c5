#pragma once

#include <cfloat>

/// Stands for an unbounded length. Finite and below FLT_MAX, so it survives conversion to float.
constexpr double RKMMathInfinite = 1.0e30;
constexpr double RKMdoubleMax = DBL_MAX;
/// Absolute threshold under which an area or a length counts as zero.
constexpr double RKMEpsilon = 1.0e-12;
constexpr double RKMPI = 3.14159265358979323846;
constexpr double RKMPIBY2 = RKMPI / 2.0;
constexpr double RKM2PI = RKMPI * 2.0;
