#include "RKMPolyExactArithmetic.h"
#include "RKMPolyGriddedPositions.h"
#include "RKMPolyMathGeoUtil.h"
#include "RKMPolyNormalizeUtils.h"

#include "RKMMathBox.h"
#include "RKMMathBox2D.h"
#include "RKMMathConstants.h"
#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"

#include <gtest/gtest.h>

#include <cfloat>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <limits>
#include <memory>
#include <random>
#include <string>
#include <tuple>
#include <vector>

namespace
{
using Mode = RKMPolyExactArithmetic::Mode;

constexpr float kNaNf = std::numeric_limits<float>::quiet_NaN();
constexpr float kInff = std::numeric_limits<float>::infinity();
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();
const float kOutOfRange = static_cast<float>(RKMMathInfinite);

// P, the half-width of the grid, as observed through ε.
double GridBound(const RKMPolyExactArithmetic &a)
{
  return std::ldexp(a.GetCoordinatePrecision(), 23);
}

// The historical float recipe for the grid bound; only meaningful while M·(2^52 + 1) stays a float.
float RecipeGridBound(float M)
{
  const float c = static_cast<float>(static_cast<double>(M) * (0x1p52 + 1.0));
  float r = static_cast<float>((static_cast<double>(c) + M) - c);
  if (M > r)
    r = 2.0f * r;
  return r;
}

// Rounds to the nearest multiple of 2ε, ties to even; exact in double for any float within ±P.
double ReferenceSnap(double v, double eps)
{
  const double unit = 2.0 * eps;
  return std::nearbyint(v / unit) * unit;
}

std::uint32_t Bits(float f)
{
  std::uint32_t u;
  std::memcpy(&u, &f, sizeof u);
  return u;
}

float FromBits(std::uint32_t u)
{
  float f;
  std::memcpy(&f, &u, sizeof f);
  return f;
}

std::string Hex(double v)
{
  char buf[64];
  std::snprintf(buf, sizeof buf, "%a", v);
  return buf;
}

// Random floats of magnitude at most P with exponents spread over the 40 binades below it, so
// that both coarse and sub-grid values show up.
float RandomFloatUpTo(std::mt19937_64 &rng, double P)
{
  std::uniform_int_distribution<int> pick(0, 3);
  std::uniform_real_distribution<double> unit(-1.0, 1.0);
  switch (pick(rng))
  {
  case 0:
    return static_cast<float>(unit(rng) * P);
  case 1:
  {
    std::uniform_int_distribution<int> de(0, 40);
    const double v = std::ldexp(std::fabs(unit(rng)), std::ilogb(P) - de(rng));
    return static_cast<float>(rng() & 1 ? v : -v);
  }
  case 2:
  {
    // Exactly half-way between two grid values, where the tie rule decides.
    const double eps = P * 0x1p-23;
    std::uniform_int_distribution<std::int64_t> k(-(1 << 22), (1 << 22) - 1);
    const double v = (static_cast<double>(k(rng)) + 0.5) * 2.0 * eps;
    const float f = static_cast<float>(v);
    return static_cast<double>(f) == v ? f : static_cast<float>(unit(rng) * P);
  }
  default:
  {
    // Few grid steps around zero, where signed zeros and the smallest magnitudes live.
    const double eps = P * 0x1p-23;
    std::uniform_int_distribution<int> k(-64, 64);
    return static_cast<float>(k(rng) * 0.5 * eps);
  }
  }
}

// Exact sign of the 2D orientation on integer grid units.
int OrientationSign(const std::int64_t *a, const std::int64_t *b, const std::int64_t *c)
{
  const __int128 det = static_cast<__int128>(b[0] - a[0]) * (c[1] - a[1]) -
                       static_cast<__int128>(b[1] - a[1]) * (c[0] - a[0]);
  return det > 0 ? 1 : (det < 0 ? -1 : 0);
}

// Exact sign of ((b − a) × (c − a)) · (d − a) on integer grid units.
int Orientation3DSign(const std::int64_t *a, const std::int64_t *b, const std::int64_t *c, const std::int64_t *d)
{
  const __int128 bx = b[0] - a[0], by = b[1] - a[1], bz = b[2] - a[2];
  const __int128 cx = c[0] - a[0], cy = c[1] - a[1], cz = c[2] - a[2];
  const __int128 dx = d[0] - a[0], dy = d[1] - a[1], dz = d[2] - a[2];
  const __int128 nx = by * cz - bz * cy, ny = bz * cx - bx * cz, nz = bx * cy - by * cx;
  const __int128 det = nx * dx + ny * dy + nz * dz;
  return det > 0 ? 1 : (det < 0 ? -1 : 0);
}
} // namespace

TEST(RKMPolyExactArithmeticGrid, DefaultInstance)
{
  RKMPolyExactArithmetic a;
  EXPECT_EQ(a.GetMode(), RKMPolyExactArithmetic::Gridded);
  EXPECT_EQ(a.GetMaxCoord(), 100000.0f);
  EXPECT_EQ(a.GetCoordinatePrecision(), 0.015625);
  EXPECT_EQ(GridBound(a), 131072.0);

  float f = 1.01f;
  a.Normalize(f);
  EXPECT_EQ(f, 1.0f);
  f = 1.02f;
  a.Normalize(f);
  EXPECT_EQ(f, 1.03125f);

  double d = 0.1;
  a.Normalize(d);
  EXPECT_EQ(d, 0.09375);
  d = 200000.0;
  a.Normalize(d);
  EXPECT_EQ(d, static_cast<double>(kOutOfRange));

  EXPECT_EQ(a.IsPointInMAX23Range(131072.0f, 0.0f, -131072.0f), 1);
  EXPECT_EQ(a.IsPointInMAX23Range(131073.0f, 0.0f, 0.0f), 0);
  EXPECT_EQ(a.IsPointInMAX23Range(0.0f, kNaNf, 0.0f), 0);
  EXPECT_EQ(a.IsPointInMAX23Range(0.0f, 0.0f, kNaNf), 0);
  EXPECT_EQ(a.IsPointInMAX23Range(kNaNf, 0.0f, 0.0f), 0);
}

TEST(RKMPolyExactArithmeticGrid, SmallMaxima)
{
  RKMPolyExactArithmetic a;
  EXPECT_EQ(a.SetMaxCoord(1.0f), S_OK);
  EXPECT_EQ(a.GetCoordinatePrecision(), 0x1p-23);
  EXPECT_EQ(a.SetMaxCoord(0.75f), S_OK);
  EXPECT_EQ(a.GetCoordinatePrecision(), 0x1p-23);
  EXPECT_EQ(a.GetMaxCoord(), 0.75f);
  EXPECT_EQ(a.SetMaxCoord(3.0f), S_OK);
  EXPECT_EQ(GridBound(a), 4.0);
  EXPECT_EQ(a.SetMaxCoord(4.0f), S_OK);
  EXPECT_EQ(GridBound(a), 4.0);
  EXPECT_EQ(a.SetMaxCoord(std::nextafter(4.0f, 5.0f)), S_OK);
  EXPECT_EQ(GridBound(a), 8.0);
}

// Powers of two, their float neighbours, random normal floats and subnormals: the bound must be
// the one the float recipe gives wherever that recipe does not overflow.
TEST(RKMPolyExactArithmeticGrid, BoundMatchesFloatRecipe)
{
  RKMPolyExactArithmetic a;
  std::vector<float> values;
  for (int e = -149; e <= 74; ++e)
  {
    const float p = std::ldexp(1.0f, e);
    values.push_back(p);
    values.push_back(std::nextafter(p, 0.0f));
    values.push_back(std::nextafter(p, kInff));
    values.push_back(1.5f * p);
  }
  const std::uint64_t seed = 0x5eed0001;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<std::uint32_t> mantissa(0, (1u << 23) - 1);
  // Exponent fields 1..201 keep M below 2^75.
  std::uniform_int_distribution<std::uint32_t> exponent(1, 201);
  for (int i = 0; i < 20000; ++i)
    values.push_back(FromBits((exponent(rng) << 23) | mantissa(rng)));
  for (int i = 0; i < 2000; ++i)
    values.push_back(FromBits(mantissa(rng) | 1u));

  for (const float M : values)
  {
    if (!(M > 0.0f))
      continue;
    SCOPED_TRACE(testing::Message() << "seed " << seed << " M " << Hex(M));
    ASSERT_EQ(a.SetMaxCoord(M), S_OK);
    ASSERT_EQ(GridBound(a), static_cast<double>(RecipeGridBound(M)));
    ASSERT_EQ(Bits(a.GetMaxCoord()), Bits(M));
  }
}

// Above 2^76 the recipe overflows; the bound is still the smallest power of two not below M.
TEST(RKMPolyExactArithmeticGrid, BoundForLargeMaxima)
{
  RKMPolyExactArithmetic a;
  const std::uint64_t seed = 0x5eed0002;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<std::uint32_t> mantissa(0, (1u << 23) - 1);
  std::uniform_int_distribution<std::uint32_t> exponent(202, 253);
  std::vector<float> values = {0x1p127f, std::nextafter(0x1p127f, 0.0f), 0x1p126f, 0x1p76f, 0x1.8p100f};
  for (int i = 0; i < 5000; ++i)
    values.push_back(FromBits((exponent(rng) << 23) | mantissa(rng)));
  for (const float M : values)
  {
    SCOPED_TRACE(testing::Message() << "seed " << seed << " M " << Hex(M));
    ASSERT_EQ(a.SetMaxCoord(M), S_OK);
    const double P = GridBound(a);
    int e;
    ASSERT_EQ(std::frexp(P, &e), 0.5) << "not a power of two: " << Hex(P);
    ASSERT_GE(P, static_cast<double>(M));
    ASSERT_LT(P / 2.0, static_cast<double>(M));
  }
}

TEST(RKMPolyExactArithmeticGrid, UnusableMaximaStillGiveAGrid)
{
  struct Case
  {
    float M;
    double P;
  };
  const Case cases[] = {
      {-3.0f, 4.0},
      {-0.75f, 1.0},
      {-100000.0f, 131072.0},
      {0.0f, 0x1p-126},
      {-0.0f, 0x1p-126},
      {kNaNf, 0x1p127},
      {kInff, 0x1p127},
      {-kInff, 0x1p127},
      {std::nextafter(0x1p127f, kInff), 0x1p127},
      {FLT_MAX, 0x1p127},
      {-FLT_MAX, 0x1p127},
  };
  for (const Case &c : cases)
  {
    SCOPED_TRACE(testing::Message() << "M " << Hex(c.M));
    RKMPolyExactArithmetic a;
    EXPECT_EQ(a.SetMaxCoord(c.M), E_INVALIDARG);
    EXPECT_EQ(GridBound(a), c.P);
    if (std::isnan(c.M))
      EXPECT_TRUE(std::isnan(a.GetMaxCoord()));
    else
      EXPECT_EQ(Bits(a.GetMaxCoord()), Bits(c.M));
  }
}

// The fallback grids sit at the ends of the float range; snapping and both orientation tests must
// still be exact there.
TEST(RKMPolyExactArithmeticGrid, FallbackGridsAreUsable)
{
  const float maxima[] = {0.0f, -0.0f, kNaNf, kInff, -kInff, FLT_MAX, -3.0f, 0x1p-130f};
  const std::uint64_t seed = 0x5eed0003;
  std::mt19937_64 rng(seed);
  for (const float M : maxima)
  {
    SCOPED_TRACE(testing::Message() << "seed " << seed << " M " << Hex(M));
    RKMPolyExactArithmetic a;
    a.SetMaxCoord(M);
    const double P = GridBound(a);
    const double unit = 2.0 * a.GetCoordinatePrecision();
    ASSERT_TRUE(std::isfinite(P));
    ASSERT_GT(P, 0.0);

    for (int i = 0; i < 2000; ++i)
    {
      float v = RandomFloatUpTo(rng, P);
      const float original = v;
      a.Normalize(v);
      ASSERT_TRUE(std::isfinite(v)) << Hex(original);
      ASSERT_EQ(std::fmod(static_cast<double>(v), unit), 0.0) << Hex(original) << " -> " << Hex(v);
      ASSERT_LE(std::fabs(static_cast<double>(v)), P);
    }

    // The grid holds 2^22 units on each side of zero; the oracle works on those units.
    std::uniform_int_distribution<std::int64_t> coord(-(1 << 22), 1 << 22);
    std::uniform_int_distribution<std::int64_t> step(-40, 40);
    auto toDouble = [unit](std::int64_t k) { return static_cast<double>(k) * unit; };
    auto inRange = [](std::int64_t k) { return k >= -(1 << 22) && k <= (1 << 22); };
    for (int i = 0; i < 3000; ++i)
    {
      std::int64_t p[4][3];
      for (auto &q : p)
        for (auto &c : q)
          c = coord(rng);
      // Mostly degenerate configurations: collinear in 2D, coplanar in 3D, sometimes nudged by one unit.
      if (i % 3 != 0)
      {
        const std::int64_t d[3] = {step(rng), step(rng), step(rng)};
        const std::int64_t e[3] = {step(rng), step(rng), step(rng)};
        const std::int64_t s = step(rng), t = step(rng), u = step(rng);
        for (int k = 0; k < 3; ++k)
        {
          p[1][k] = p[0][k] + s * d[k];
          p[2][k] = p[0][k] + t * d[k] + u * e[k];
          p[3][k] = p[0][k] + (s + t) * d[k] - u * e[k];
        }
        if (i % 3 == 1)
          for (int k = 0; k < 3; ++k)
            p[2][k] = p[0][k] + t * d[k];
        if (i % 7 == 0)
          p[3][i % 3] += (i & 8) ? 1 : -1;
        if (i % 11 == 0)
          p[2][1] += 1;
      }
      bool ok = true;
      for (auto &q : p)
        for (auto c : q)
          ok = ok && inRange(c);
      if (!ok)
        continue;
      double pd[4][3];
      for (int j = 0; j < 4; ++j)
        for (int k = 0; k < 3; ++k)
          pd[j][k] = toDouble(p[j][k]);
      const std::int64_t p2[3][2] = {{p[0][0], p[0][1]}, {p[1][0], p[1][1]}, {p[2][0], p[2][1]}};
      ASSERT_EQ(a.Orientation2D(pd[0], pd[1], pd[2]), OrientationSign(p2[0], p2[1], p2[2])) << "case " << i;
      ASSERT_EQ(a.Orientation3D(pd[0], pd[1], pd[2], pd[3]), Orientation3DSign(p[0], p[1], p[2], p[3]))
          << "case " << i;
    }
  }
}

TEST(RKMPolyExactArithmeticSnap, MatchesNearestEvenMultipleOfTwoEpsilon)
{
  const float maxima[] = {1.0f, 0.75f, 3.0f, 100000.0f, 1e-3f, 0x1p-100f, 0x1p-126f, 0x1p-130f, 1e-45f,
                          0x1p60f, 0x1.8p100f, 0x1p127f, 0.0f, kNaNf};
  const std::uint64_t seed = 0x5eed0004;
  std::mt19937_64 rng(seed);
  for (const float M : maxima)
  {
    RKMPolyExactArithmetic a;
    a.SetMaxCoord(M);
    const double P = GridBound(a);
    const double eps = a.GetCoordinatePrecision();
    for (int i = 0; i < 20000; ++i)
    {
      const float v = RandomFloatUpTo(rng, P);
      const double expected = ReferenceSnap(v, eps);
      float viaNormalize = v, viaGrid = v;
      a.Normalize(viaNormalize);
      a.Grid(viaGrid);
      ASSERT_EQ(static_cast<double>(viaNormalize), expected)
          << "seed " << seed << " M " << Hex(M) << " v " << Hex(v) << " case " << i;
      ASSERT_EQ(Bits(viaGrid), Bits(viaNormalize));
    }
  }
}

TEST(RKMPolyExactArithmeticSnap, BoundsAndBeyond)
{
  const float maxima[] = {1.0f, 100000.0f, 0x1p-126f, 0x1p127f};
  for (const float M : maxima)
  {
    SCOPED_TRACE(testing::Message() << "M " << Hex(M));
    RKMPolyExactArithmetic a;
    a.SetMaxCoord(M);
    const float P = static_cast<float>(GridBound(a));
    float v = P;
    a.Normalize(v);
    EXPECT_EQ(v, P);
    v = -P;
    a.Normalize(v);
    EXPECT_EQ(v, -P);
    EXPECT_EQ(a.IsPointInMAX23Range(P, -P, 0.0f), 1);

    const float above = std::nextafter(P, kInff);
    for (const float out : {above, 2.0f * P, FLT_MAX, kInff})
    {
      v = out;
      a.Normalize(v);
      EXPECT_EQ(v, kOutOfRange) << Hex(out);
      v = -out;
      a.Normalize(v);
      EXPECT_EQ(std::fabs(v), kOutOfRange) << Hex(-out);
      EXPECT_EQ(a.IsPointInMAX23Range(out, 0.0f, 0.0f), 0);
      EXPECT_EQ(a.IsPointInMAX23Range(0.0f, -out, 0.0f), 0);
      EXPECT_EQ(a.IsPointInMAX23Range(0.0f, 0.0f, out), 0);
    }
  }
}

TEST(RKMPolyExactArithmeticSnap, TiesGoToEvenMultiples)
{
  RKMPolyExactArithmetic a;
  a.SetMaxCoord(1.0f);
  const double unit = 0x1p-22;
  const struct
  {
    double v, expected;
  } cases[] = {
      {0.5 * unit, 0.0},         {1.5 * unit, 2.0 * unit},  {2.5 * unit, 2.0 * unit},
      {-0.5 * unit, 0.0},        {-1.5 * unit, -2.0 * unit}, {-2.5 * unit, -2.0 * unit},
      {0.5 + 0.5 * unit, 0.5},   {0.5 + 1.5 * unit, 0.5 + 2.0 * unit},
  };
  for (const auto &c : cases)
  {
    float f = static_cast<float>(c.v);
    ASSERT_EQ(static_cast<double>(f), c.v);
    a.Normalize(f);
    EXPECT_EQ(static_cast<double>(f), c.expected) << Hex(c.v);
  }
}

// A double is rounded to float before snapping, which can turn a value just above a tie into the
// tie itself.
TEST(RKMPolyExactArithmeticSnap, DoubleIsRoundedToFloatFirst)
{
  RKMPolyExactArithmetic a;
  a.SetMaxCoord(1.0f);
  double d = 0.5 + 0x1p-23 + 0x1p-40;
  a.Normalize(d);
  EXPECT_EQ(d, 0.5);

  const std::uint64_t seed = 0x5eed0005;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-1.0, 1.0);
  for (int i = 0; i < 5000; ++i)
  {
    const double v = u(rng);
    double snapped = v;
    a.Normalize(snapped);
    ASSERT_EQ(snapped, ReferenceSnap(static_cast<float>(v), a.GetCoordinatePrecision()))
        << "seed " << seed << " v " << Hex(v);
  }
}

TEST(RKMPolyExactArithmeticSnap, PointsSnapEveryCoordinate)
{
  RKMPolyExactArithmetic a;
  RKMMathPoint2D p2(1.01, 0.1);
  a.Normalize(p2);
  EXPECT_EQ(p2.x, 1.0);
  EXPECT_EQ(p2.y, 0.09375);
  RKMMathPoint p3(1.02, -0.1, 200000.0);
  a.Normalize(p3);
  EXPECT_EQ(p3.x, 1.03125);
  EXPECT_EQ(p3.y, -0.09375);
  EXPECT_EQ(p3.z, static_cast<double>(kOutOfRange));
}

TEST(RKMPolyExactArithmeticSnap, AdaptiveModesLeaveValuesAlone)
{
  for (const Mode mode : {RKMPolyExactArithmetic::Adaptive, RKMPolyExactArithmetic::Adaptive2})
  {
    SCOPED_TRACE(testing::Message() << "mode " << mode);
    RKMPolyExactArithmetic a(mode);
    EXPECT_EQ(a.GetMode(), mode);
    ASSERT_EQ(a.SetMaxCoord(1000.005f), S_OK);
    EXPECT_EQ(a.GetMaxNormalizedCoord(), 1000.005f);

    float f = 1.01f;
    a.Normalize(f);
    EXPECT_EQ(f, 1.01f);
    double d = 0.1;
    a.Normalize(d);
    EXPECT_EQ(d, 0.1);
    d = 1e6;
    a.Normalize(d);
    EXPECT_EQ(d, 1e6);
    RKMMathPoint p(0.1, 0.2, 0.3);
    a.Normalize(p);
    EXPECT_EQ(p, RKMMathPoint(0.1, 0.2, 0.3));
    RKMMathPoint2D q(0.1, 0.2);
    a.Normalize(q);
    EXPECT_EQ(q, RKMMathPoint2D(0.1, 0.2));

    // Grid snaps whatever the mode.
    a.SetMaxCoord(100000.0f);
    f = 1.01f;
    a.Grid(f);
    EXPECT_EQ(f, 1.0f);
  }

  RKMPolyExactArithmetic g;
  g.SetMaxCoord(1000.005f);
  EXPECT_EQ(static_cast<double>(g.GetMaxNormalizedCoord()),
            ReferenceSnap(1000.005f, g.GetCoordinatePrecision()));
  EXPECT_NE(g.GetMaxNormalizedCoord(), 1000.005f);
}

TEST(RKMPolyExactArithmeticSnap, UnknownModeNeitherSnapsNorOrients)
{
  RKMPolyExactArithmetic a(static_cast<Mode>(7));
  float f = 1.01f;
  a.Normalize(f);
  EXPECT_EQ(f, 1.01f);
  a.Grid(f);
  EXPECT_EQ(f, 1.0f);
  const double p[] = {0, 0, 0}, q[] = {1, 0, 0}, r[] = {0, 1, 0}, s[] = {0, 0, 1};
  EXPECT_EQ(a.Orientation2D(p, q, r), 0);
  EXPECT_EQ(a.Orientation3D(p, q, r, s), 0);
}

TEST(RKMPolyExactArithmeticCompare, ScalarsAndNaN)
{
  const RKMPolyExactArithmetic a;
  EXPECT_EQ(a.Compare(1.0, 2.0), -1);
  EXPECT_EQ(a.Compare(2.0, 1.0), 1);
  EXPECT_EQ(a.Compare(2.0, 2.0), 0);
  EXPECT_EQ(a.Compare(0.0, -0.0), 0);
  EXPECT_EQ(a.Compare(-kInf, kInf), -1);
  EXPECT_EQ(a.Compare(kNaN, 1.0), 0);
  EXPECT_EQ(a.Compare(1.0, kNaN), 0);
  EXPECT_EQ(a.Compare(kNaN, kNaN), 0);

  EXPECT_EQ(a.Equal(1.0, 1.0), 1);
  EXPECT_EQ(a.Equal(0.0, -0.0), 1);
  EXPECT_EQ(a.Equal(1.0, std::nextafter(1.0, 2.0)), 0);
  EXPECT_EQ(a.Equal(kNaN, kNaN), 0);
  EXPECT_EQ(a.Equal(kNaN, 1.0), 0);

  EXPECT_EQ(a.Equal(RKMMathPoint2D(1, 2), RKMMathPoint2D(1, 2)), 1);
  EXPECT_EQ(a.Equal(RKMMathPoint2D(1, 2), RKMMathPoint2D(1, 3)), 0);
  EXPECT_EQ(a.Equal(RKMMathPoint2D(1, 2), RKMMathPoint2D(0, 2)), 0);
  EXPECT_EQ(a.Equal(RKMMathPoint2D(kNaN, 2), RKMMathPoint2D(kNaN, 2)), 0);
  EXPECT_EQ(a.Equal(RKMMathPoint(1, 2, 3), RKMMathPoint(1, 2, 3)), 1);
  EXPECT_EQ(a.Equal(RKMMathPoint(1, 2, 3), RKMMathPoint(1, 2, 4)), 0);
  EXPECT_EQ(a.Equal(RKMMathPoint(1, kNaN, 3), RKMMathPoint(1, kNaN, 3)), 0);
}

TEST(RKMPolyExactArithmeticCompare, LexicographicOrders)
{
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint2D(1, 5), RKMMathPoint2D(1, 2)), 1);
  EXPECT_EQ(RKMPolyCompareBelowAbove(RKMMathPoint2D(9, 2), RKMMathPoint2D(1, 5)), -1);
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint2D(9, 2), RKMMathPoint2D(1, 5)), 1);
  EXPECT_EQ(RKMPolyCompareBelowAbove(RKMMathPoint2D(1, 5), RKMMathPoint2D(1, 2)), 1);

  // NaN keys count as equal, so the next key decides.
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint2D(kNaN, 1), RKMMathPoint2D(0, 2)), -1);
  EXPECT_EQ(RKMPolyCompareBelowAbove(RKMMathPoint2D(3, kNaN), RKMMathPoint2D(1, 0)), 1);
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint2D(kNaN, kNaN), RKMMathPoint2D(0, 2)), 0);
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint(1, kNaN, 0), RKMMathPoint(1, 5, 1)), -1);
  EXPECT_EQ(RKMPolyCompareBelowAbove(RKMMathPoint(1, 0, kNaN), RKMMathPoint(0, 0, 5)), 1);

  const std::uint64_t seed = 0x5eed0006;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-1, 1);
  const RKMPolyExactArithmetic a;
  auto sign = [](auto l, auto r) { return l < r ? -1 : (r < l ? 1 : 0); };
  for (int i = 0; i < 2000; ++i)
  {
    const RKMMathPoint p(c(rng), c(rng), c(rng)), q(c(rng), c(rng), c(rng));
    SCOPED_TRACE(testing::Message() << "seed " << seed << " case " << i);
    ASSERT_EQ(RKMPolyCompareLeftRight(p, q), sign(std::tie(p.x, p.y, p.z), std::tie(q.x, q.y, q.z)));
    ASSERT_EQ(RKMPolyCompareBelowAbove(p, q), sign(std::tie(p.z, p.y, p.x), std::tie(q.z, q.y, q.x)));
    const RKMMathPoint2D p2(p.x, p.y), q2(q.x, q.y);
    ASSERT_EQ(RKMPolyCompareLeftRight(p2, q2), sign(std::tie(p2.x, p2.y), std::tie(q2.x, q2.y)));
    ASSERT_EQ(RKMPolyCompareBelowAbove(p2, q2), sign(std::tie(p2.y, p2.x), std::tie(q2.y, q2.x)));
    ASSERT_EQ(a.CompareLeftRight(p2, q2), RKMPolyCompareLeftRight(p2, q2));
    ASSERT_EQ(a.CompareBelowAbove(p2, q2), RKMPolyCompareBelowAbove(p2, q2));
  }
}

namespace
{
struct Limits2
{
  double v[4];
};
Limits2 LimitsOf(const RKMMathBox2D &b)
{
  Limits2 l{};
  EXPECT_EQ(b.GetLimits(l.v[0], l.v[1], l.v[2], l.v[3]), S_OK);
  return l;
}
struct Limits3
{
  double v[6];
};
Limits3 LimitsOf(const RKMMathBox &b)
{
  Limits3 l{};
  b.GetExtremities(l.v[0], l.v[1], l.v[2], l.v[3], l.v[4], l.v[5]);
  return l;
}
bool SameBits(const double *a, const double *b, int n)
{
  return std::memcmp(a, b, sizeof(double) * n) == 0;
}
} // namespace

TEST(RKMPolyMathGeoUtil, MaximumCoordinate)
{
  double m = 7.0;
  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox(), m), E_FAIL);
  EXPECT_EQ(m, 0.0);
  m = 7.0;
  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox2D(), m), E_FAIL);
  EXPECT_EQ(m, 0.0);

  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox(-5, 3, 1, 2, 0, 4), m), S_OK);
  EXPECT_EQ(m, 5.0);
  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox(1, 2, 1, 2, -3, 6.5), m), S_OK);
  EXPECT_EQ(m, 6.5);
  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox2D(-1, 0.5, -9, -8), m), S_OK);
  EXPECT_EQ(m, 9.0);
  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox2D(0, 0, 0, 0), m), S_OK);
  EXPECT_EQ(m, 0.0);
  EXPECT_EQ(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox(0, 1, kNaN, 1, 0, 1), m), S_OK);
  EXPECT_EQ(m, kInf);
}

TEST(RKMPolyNormalizeUtils, NormalizeBoxSnapsLimitsInGriddedMode)
{
  const RKMPolyExactArithmetic a;
  const double eps = a.GetCoordinatePrecision();
  RKMMathBox2D b2(-1.01, 1.02, 0.1, 131072.0);
  EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b2), S_OK);
  Limits2 l2 = LimitsOf(b2);
  EXPECT_EQ(l2.v[0], -1.0);
  EXPECT_EQ(l2.v[1], 1.03125);
  EXPECT_EQ(l2.v[2], 0.09375);
  EXPECT_EQ(l2.v[3], 131072.0);

  const std::uint64_t seed = 0x5eed0007;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-131072.0, 131072.0);
  for (int i = 0; i < 2000; ++i)
  {
    double lim[6];
    for (int k = 0; k < 3; ++k)
    {
      lim[2 * k] = u(rng);
      lim[2 * k + 1] = u(rng);
      if (lim[2 * k] > lim[2 * k + 1])
        std::swap(lim[2 * k], lim[2 * k + 1]);
    }
    RKMMathBox b(lim[0], lim[1], lim[2], lim[3], lim[4], lim[5]);
    ASSERT_EQ(RKMPolyNormalizeUtils::Normalize(a, b), S_OK) << "seed " << seed << " case " << i;
    const Limits3 out = LimitsOf(b);
    for (int k = 0; k < 6; ++k)
    {
      ASSERT_EQ(out.v[k], ReferenceSnap(static_cast<float>(lim[k]), eps)) << "seed " << seed << " case " << i;
      ASSERT_LE(std::fabs(out.v[k] - static_cast<float>(lim[k])), eps);
    }
  }
}

TEST(RKMPolyNormalizeUtils, NormalizeBoxRefusesLimitsOffTheGrid)
{
  const RKMPolyExactArithmetic a;
  const double bad[] = {200000.0, -131073.0, kInf, -kInf, kNaN, 1e300};
  for (const double v : bad)
  {
    SCOPED_TRACE(testing::Message() << "limit " << v);
    const bool high = v > 0 || std::isnan(v);
    RKMMathBox b(0.1, high ? v : 1.0, high ? 0.1 : v, 1.0, 0.1, 1.0);
    const Limits3 before = LimitsOf(b);
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b), E_FAIL);
    const Limits3 after = LimitsOf(b);
    EXPECT_TRUE(SameBits(before.v, after.v, 6));

    RKMMathBox2D b2(0.1, 1.0, high ? 0.1 : v, high ? v : 1.0);
    const Limits2 before2 = LimitsOf(b2);
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b2), E_FAIL);
    const Limits2 after2 = LimitsOf(b2);
    EXPECT_TRUE(SameBits(before2.v, after2.v, 4));
  }

  RKMMathBox empty;
  EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, empty), E_FAIL);
  EXPECT_TRUE(empty.IsEmpty());
  RKMMathBox2D empty2;
  EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, empty2), E_FAIL);
  EXPECT_TRUE(empty2.IsEmpty());
}

TEST(RKMPolyNormalizeUtils, NormalizeBoxIgnoredInAdaptiveModes)
{
  for (const Mode mode : {RKMPolyExactArithmetic::Adaptive, RKMPolyExactArithmetic::Adaptive2})
  {
    const RKMPolyExactArithmetic a(mode);
    RKMMathBox b(-1.01, 200000.0, 0.1, kInf, -kInf, 0.3);
    const Limits3 before = LimitsOf(b);
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b), S_OK);
    const Limits3 after = LimitsOf(b);
    EXPECT_TRUE(SameBits(before.v, after.v, 6));

    RKMMathBox2D b2(-1.01, 1.02, 0.1, 3e5);
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b2), S_OK);
    const Limits2 l2 = LimitsOf(b2);
    EXPECT_EQ(l2.v[0], -1.01);
    EXPECT_EQ(l2.v[3], 3e5);
  }
}

TEST(RKMPolyNormalizeUtils, NormalizeBoundingBoxCreatesOrReconfigures)
{
  {
    RKMMathBox b(-1.01, 3.3, 0.1, 2.0, -700.2, 5.0);
    RKMPolyExactArithmetic *a = nullptr;
    ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), S_OK);
    std::unique_ptr<RKMPolyExactArithmetic> owned(a);
    ASSERT_NE(a, nullptr);
    EXPECT_EQ(a->GetMode(), RKMPolyExactArithmetic::Gridded);
    EXPECT_EQ(a->GetMaxCoord(), 700.2f);
    EXPECT_EQ(GridBound(*a), 1024.0);
    const Limits3 l = LimitsOf(b);
    const double eps = a->GetCoordinatePrecision();
    const double original[] = {-1.01, 3.3, 0.1, 2.0, -700.2, 5.0};
    for (int k = 0; k < 6; ++k)
      EXPECT_EQ(l.v[k], ReferenceSnap(static_cast<float>(original[k]), eps)) << k;
  }
  {
    RKMMathBox2D b(-1.01, 3.3, 0.1, 2.5);
    RKMPolyExactArithmetic *a = nullptr;
    ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), S_OK);
    std::unique_ptr<RKMPolyExactArithmetic> owned(a);
    ASSERT_NE(a, nullptr);
    EXPECT_EQ(a->GetMaxCoord(), 3.3f);
    EXPECT_EQ(GridBound(*a), 4.0);
    const Limits2 l = LimitsOf(b);
    EXPECT_EQ(l.v[0], ReferenceSnap(static_cast<float>(-1.01), a->GetCoordinatePrecision()));
  }
  {
    RKMPolyExactArithmetic adaptive(RKMPolyExactArithmetic::Adaptive);
    RKMPolyExactArithmetic *a = &adaptive;
    RKMMathBox b(-1.01, 3.3, 0.1, 2.0, -7.2, 5.0);
    const Limits3 before = LimitsOf(b);
    ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), S_OK);
    EXPECT_EQ(a, &adaptive);
    EXPECT_EQ(adaptive.GetMode(), RKMPolyExactArithmetic::Adaptive);
    EXPECT_EQ(adaptive.GetMaxCoord(), 7.2f);
    EXPECT_EQ(GridBound(adaptive), 8.0);
    const Limits3 after = LimitsOf(b);
    EXPECT_TRUE(SameBits(before.v, after.v, 6));
  }
}

TEST(RKMPolyNormalizeUtils, NormalizeBoundingBoxRefusesUnusableBoxes)
{
  RKMMathBox empty;
  RKMPolyExactArithmetic *a = nullptr;
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(empty, a), E_FAIL);
  EXPECT_EQ(a, nullptr);
  RKMMathBox2D empty2;
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(empty2, a), E_FAIL);
  EXPECT_EQ(a, nullptr);

  for (const double bad : {kInf, kNaN, 1e300})
  {
    SCOPED_TRACE(testing::Message() << "limit " << bad);
    RKMMathBox b(0, 1, 0, bad, 0, 1);
    const Limits3 before = LimitsOf(b);
    a = nullptr;
    EXPECT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), E_FAIL);
    EXPECT_EQ(a, nullptr);
    delete a;
    EXPECT_TRUE(SameBits(before.v, LimitsOf(b).v, 6));

    RKMPolyExactArithmetic existing;
    existing.SetMaxCoord(5.0f);
    a = &existing;
    EXPECT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), E_FAIL);
    EXPECT_EQ(a, &existing);
    EXPECT_EQ(existing.GetMaxCoord(), 5.0f);
    EXPECT_EQ(GridBound(existing), 8.0);
    EXPECT_TRUE(SameBits(before.v, LimitsOf(b).v, 6));

    RKMMathBox2D b2(-bad, 0, 0, 1);
    a = nullptr;
    EXPECT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b2, a), E_FAIL);
    EXPECT_EQ(a, nullptr);
    delete a;
  }
}

TEST(RKMPolyNormalizeUtils, BoxAtTheOriginGetsTheFinestGrid)
{
  RKMMathBox b(0, 0, 0, 0, 0, 0);
  RKMPolyExactArithmetic *a = nullptr;
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), S_OK);
  std::unique_ptr<RKMPolyExactArithmetic> owned(a);
  ASSERT_NE(a, nullptr);
  EXPECT_EQ(a->GetMaxCoord(), 0.0f);
  EXPECT_EQ(GridBound(*a), 0x1p-126);
  const Limits3 l = LimitsOf(b);
  for (double v : l.v)
    EXPECT_EQ(v, 0.0);
  float f = 0.0f;
  a->Normalize(f);
  EXPECT_EQ(f, 0.0f);
  const double p[] = {0, 0}, q[] = {0x1p-140, 0}, r[] = {0, 0x1p-140};
  EXPECT_EQ(a->Orientation2D(p, q, r), 1);
  EXPECT_EQ(a->Orientation2D(p, r, q), -1);

  RKMMathBox2D b2(0, 0, 0, 0);
  RKMPolyExactArithmetic *a2 = nullptr;
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b2, a2), S_OK);
  std::unique_ptr<RKMPolyExactArithmetic> owned2(a2);
  ASSERT_NE(a2, nullptr);
  EXPECT_EQ(GridBound(*a2), 0x1p-126);
}

TEST(RKMPolyNormalizeUtils, NormalizePointsSnapsBoxAndPoints)
{
  const std::uint64_t seed = 0x5eed0008;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> count(1, 12), scaleExp(-20, 40);
  std::uniform_real_distribution<double> u(-1.0, 1.0);
  for (int iter = 0; iter < 300; ++iter)
  {
    SCOPED_TRACE(testing::Message() << "seed " << seed << " case " << iter);
    const int n = count(rng);
    const double scale = std::ldexp(1.0, scaleExp(rng));
    // Float-representable input, so that the only movement is the snap itself.
    auto coord = [&] { return static_cast<double>(static_cast<float>(u(rng) * scale)); };
    std::vector<RKMMathPoint> pts(n), orig;
    double maxAbs = 0.0;
    for (auto &p : pts)
    {
      p = RKMMathPoint(coord(), coord(), coord());
      maxAbs = std::max({maxAbs, std::fabs(p.x), std::fabs(p.y), std::fabs(p.z)});
    }
    orig = pts;

    RKMMathBox box(-5, 5, -5, 5, -5, 5);
    RKMPolyExactArithmetic *a = nullptr;
    const HRESULT hr = RKMPolyNormalizeUtils::NormalizePoints(pts.data(), n, box, a);
    std::unique_ptr<RKMPolyExactArithmetic> owned(a);
    if (maxAbs == 0.0)
      continue;
    ASSERT_EQ(hr, S_OK);
    ASSERT_NE(a, nullptr);
    EXPECT_EQ(a->GetMaxCoord(), static_cast<float>(maxAbs));
    const double eps = a->GetCoordinatePrecision();
    RKMMathBox expected;
    for (const auto &p : orig)
      expected.AddInside(p);
    const Limits3 el = LimitsOf(expected), bl = LimitsOf(box);
    for (int k = 0; k < 6; ++k)
      ASSERT_EQ(bl.v[k], ReferenceSnap(el.v[k], eps)) << k;
    for (int i = 0; i < n; ++i)
      for (int k = 0; k < 3; ++k)
      {
        ASSERT_EQ(pts[i][k], ReferenceSnap(orig[i][k], eps)) << i << "," << k;
        ASSERT_LE(std::fabs(pts[i][k] - orig[i][k]), eps);
      }
    for (const auto &p : pts)
      ASSERT_TRUE(box.IsContaining(p));
  }
}

TEST(RKMPolyNormalizeUtils, NormalizePoints2DReusesAnArithmetic)
{
  RKMMathPoint2D pts[] = {{1.01, -2.0}, {0.1, 3.7}, {-3.2, 0.0}};
  RKMPolyExactArithmetic existing;
  RKMPolyExactArithmetic *a = &existing;
  RKMMathBox2D box;
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizePoints(pts, 3, box, a), S_OK);
  EXPECT_EQ(a, &existing);
  EXPECT_EQ(existing.GetMaxCoord(), 3.7f);
  const double eps = existing.GetCoordinatePrecision();
  EXPECT_EQ(eps, 0x1p-21);
  EXPECT_EQ(pts[0].x, ReferenceSnap(1.01f, eps));
  EXPECT_EQ(pts[1].x, ReferenceSnap(0.1f, eps));
  EXPECT_EQ(pts[1].y, ReferenceSnap(3.7f, eps));
  const Limits2 l = LimitsOf(box);
  EXPECT_EQ(l.v[0], ReferenceSnap(-3.2f, eps));
  EXPECT_EQ(l.v[1], pts[0].x);
  EXPECT_EQ(l.v[2], -2.0);
  EXPECT_EQ(l.v[3], pts[1].y);
}

TEST(RKMPolyNormalizeUtils, NormalizePointsRejectsBadInput)
{
  RKMMathBox box;
  RKMMathBox2D box2;
  RKMPolyExactArithmetic *a = nullptr;
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(static_cast<RKMMathPoint *>(nullptr), 3, box, a), E_INVALIDARG);
  EXPECT_EQ(a, nullptr);
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(static_cast<RKMMathPoint2D *>(nullptr), 1, box2, a),
            E_INVALIDARG);
  EXPECT_EQ(a, nullptr);

  RKMMathPoint one(1, 2, 3);
  box = RKMMathBox(0, 1, 0, 1, 0, 1);
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(&one, 0, box, a), E_FAIL);
  EXPECT_EQ(a, nullptr);
  EXPECT_TRUE(box.IsEmpty());
  EXPECT_EQ(one, RKMMathPoint(1, 2, 3));
  box2 = RKMMathBox2D(0, 1, 0, 1);
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(static_cast<RKMMathPoint2D *>(nullptr), 0, box2, a), E_FAIL);
  EXPECT_EQ(a, nullptr);
  EXPECT_TRUE(box2.IsEmpty());

  RKMMathPoint withNaN[] = {{1.01, 2, 3}, {kNaN, 0.1, 0}};
  EXPECT_TRUE(FAILED(RKMPolyNormalizeUtils::NormalizePoints(withNaN, 2, box, a)));
  EXPECT_EQ(a, nullptr);
  delete a;
  EXPECT_EQ(withNaN[0], RKMMathPoint(1.01, 2, 3));
  EXPECT_EQ(withNaN[1].y, 0.1);

  RKMMathPoint2D withNaN2[] = {{1.01, 2}, {0.1, kNaN}};
  RKMPolyExactArithmetic existing;
  a = &existing;
  EXPECT_TRUE(FAILED(RKMPolyNormalizeUtils::NormalizePoints(withNaN2, 2, box2, a)));
  EXPECT_EQ(a, &existing);
  EXPECT_EQ(existing.GetMaxCoord(), 100000.0f);
  EXPECT_EQ(withNaN2[0].x, 1.01);
  EXPECT_EQ(withNaN2[1].x, 0.1);
}

namespace
{
class VectorPositions : public RKMPolyGriddedPositions
{
public:
  explicit VectorPositions(const RKMPolyExactArithmetic &a) : RKMPolyGriddedPositions(a) {}

  HRESULT GetPosition(int index, RKMMathPoint &p) const override
  {
    if (index < 0 || index >= static_cast<int>(m_points.size()))
      return E_INVALIDARG;
    p = m_points[index];
    return S_OK;
  }
  HRESULT SetPosition(int index, const RKMMathPoint &p) override
  {
    if (index < 0)
      return E_INVALIDARG;
    RKMMathPoint q = p;
    GetExactArithmetic().Normalize(q);
    if (static_cast<int>(m_points.size()) <= index)
      m_points.resize(index + 1);
    m_points[index] = q;
    return S_OK;
  }

private:
  std::vector<RKMMathPoint> m_points;
};
} // namespace

TEST(RKMPolyGriddedPositions, DerivedClassKeepsItsArithmetic)
{
  RKMPolyExactArithmetic a, other(RKMPolyExactArithmetic::Adaptive);
  VectorPositions positions(a);
  EXPECT_EQ(&positions.GetExactArithmetic(), &a);
  ASSERT_EQ(positions.SetPosition(2, RKMMathPoint(1.01, 0.1, -1.02)), S_OK);

  const VectorPositions copy(positions);
  EXPECT_EQ(&copy.GetExactArithmetic(), &a);
  RKMMathPoint p(9, 9, 9);
  ASSERT_EQ(copy.GetPosition(2, p), S_OK);
  EXPECT_EQ(p, RKMMathPoint(1.0, 0.09375, -1.03125));
  EXPECT_TRUE(FAILED(copy.GetPosition(5, p)));

  std::unique_ptr<RKMPolyGriddedPositionsConst> base = std::make_unique<VectorPositions>(other);
  EXPECT_EQ(&base->GetExactArithmetic(), &other);
}
