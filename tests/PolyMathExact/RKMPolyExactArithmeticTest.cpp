#include "ExactRefOracle.h"

#include "RKMPolyExactArithmetic.h"
#include "RKMPolyMathGeoUtil.h"
#include "RKMPolyNormalizeUtils.h"

#include "RKMMathBox.h"
#include "RKMMathBox2D.h"
#include "RKMMathConstants.h"
#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"

#include <gtest/gtest.h>

#include <cfloat>
#include <cstring>
#include <limits>
#include <memory>
#include <random>
#include <tuple>
#include <vector>

using exactref::Hex;

namespace
{
using Arith = RKMPolyExactArithmetic;
using Mode = RKMPolyExactArithmetic::Mode;
constexpr float kNaNf = std::numeric_limits<float>::quiet_NaN(), kInff = std::numeric_limits<float>::infinity();
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN(), kInf = std::numeric_limits<double>::infinity();
const float kOutOfRange = static_cast<float>(RKMMathInfinite);

// P, the half-width of the grid, as observed through ε.
double GridBound(const Arith &a) { return std::ldexp(a.GetCoordinatePrecision(), 23); }
template <class T> T Snapped(const Arith &a, T v) { return a.Normalize(v), v; }
float Gridded(const Arith &a, float v) { return a.Grid(v), v; }
// How many of the points (v, 0, 0), (0, v, 0), (0, 0, v) are within ±P.
int InRange(const Arith &a, float v)
{
  return a.IsPointInMAX23Range(v, 0, 0) + a.IsPointInMAX23Range(0, v, 0) + a.IsPointInMAX23Range(0, 0, v);
}
std::uint32_t Bits(float f) { return __builtin_bit_cast(std::uint32_t, f); }
float FromBits(std::uint32_t u) { return __builtin_bit_cast(float, u); }

// The historical float recipe for the grid bound; only meaningful while M·(2^52 + 1) stays a float.
float RecipeGridBound(float M)
{
  const float c = static_cast<float>(static_cast<double>(M) * (0x1p52 + 1.0));
  const float r = static_cast<float>((static_cast<double>(c) + M) - c);
  return M > r ? 2.0f * r : r;
}

// The nearest multiple of 2ε, ties to even; exact in double for any float within ±P.
double ReferenceSnap(double v, double eps) { return std::nearbyint(v / (2.0 * eps)) * (2.0 * eps); }

// Floats of magnitude at most P: uniform, over the 40 binades below P, exactly half-way between
// two grid values (where the tie rule decides), or a few grid steps around zero.
float RandomFloatUpTo(std::mt19937_64 &rng, double P)
{
  std::uniform_real_distribution<double> unit(-1.0, 1.0);
  const double eps = P * 0x1p-23;
  const int pick = std::uniform_int_distribution<int>(0, 3)(rng);
  if (pick == 0)
    return static_cast<float>(unit(rng) * P);
  if (pick == 1)
  {
    const double v = std::ldexp(std::fabs(unit(rng)), std::ilogb(P) - std::uniform_int_distribution<int>(0, 40)(rng));
    return static_cast<float>(rng() & 1 ? v : -v);
  }
  if (pick == 3)
    return static_cast<float>(std::uniform_int_distribution<int>(-64, 64)(rng) * 0.5 * eps);
  const double v = (std::uniform_int_distribution<std::int64_t>(-(1 << 22), (1 << 22) - 1)(rng) + 0.5) * 2.0 * eps;
  return static_cast<double>(static_cast<float>(v)) == v ? static_cast<float>(v) : static_cast<float>(unit(rng) * P);
}
} // namespace

TEST(RKMPolyExactArithmeticGrid, DefaultInstanceSnapsToThirtySecondths)
{
  const Arith a;
  EXPECT_TRUE(a.GetMode() == Arith::Gridded && a.GetMaxCoord() == 100000.0f && a.GetCoordinatePrecision() == 0.015625);
  EXPECT_TRUE(Snapped(a, RKMMathPoint2D(1.01, 0.1)) == RKMMathPoint2D(1.0, 0.09375));
  EXPECT_EQ(Snapped(a, RKMMathPoint(1.02, -0.1, 200000.0)), RKMMathPoint(1.03125, -0.09375, kOutOfRange));
  EXPECT_EQ(InRange(a, kNaNf), 0);
}

// Powers of two, their float neighbours, random normal, subnormal and large floats: P is the
// smallest power of two not below M, which is what the float recipe gives below 2^75, where it
// does not overflow.
TEST(RKMPolyExactArithmeticGrid, BoundIsThePowerOfTwoAboveTheMaximum)
{
  std::vector<float> values = {0x1p127f, std::nextafter(0x1p127f, 0.0f), 0x1p126f, 0x1p76f, 0x1.8p100f};
  for (int e = -149; e <= 74; ++e)
  {
    const float p = std::ldexp(1.0f, e);
    values.insert(values.end(), {p, std::nextafter(p, 0.0f), std::nextafter(p, kInff), 1.5f * p});
  }
  std::mt19937_64 rng(0x5eed0001), large(0x5eed0002);
  std::uniform_int_distribution<std::uint32_t> mantissa(0, (1u << 23) - 1), exponent(1, 201), high(202, 253);
  for (int i = 0; i < 20000; ++i)
    values.push_back(FromBits((exponent(rng) << 23) | mantissa(rng)));
  for (int i = 0; i < 2000; ++i)
    values.push_back(FromBits(mantissa(rng) | 1u));
  for (int i = 0; i < 5000; ++i)
    values.push_back(FromBits((high(large) << 23) | mantissa(large)));
  Arith a;
  for (const float M : values)
  {
    if (!(M > 0.0f))
      continue;
    ASSERT_TRUE(a.SetMaxCoord(M) == S_OK && Bits(a.GetMaxCoord()) == Bits(M)) << "seeds 0x5eed0001/2, M " << Hex(M);
    const double P = GridBound(a);
    int e;
    ASSERT_TRUE(std::frexp(P, &e) == 0.5 && P >= M && P / 2.0 < M) << "M " << Hex(M) << ", P " << Hex(P);
    ASSERT_TRUE(M >= 0x1p75f || P == RecipeGridBound(M)) << "M " << Hex(M) << ", P " << Hex(P);
  }
}

// Refused maxima still set a grid: the one of |M|, or the finest for 0, or the widest.
TEST(RKMPolyExactArithmeticGrid, UnusableMaximaStillGiveAGrid)
{
  const float above = std::nextafter(0x1p127f, kInff);
  const std::pair<float, double> cases[] = {{-3.0f, 4.0},        {-0.75f, 1.0},     {-100000.0f, 131072.0},
                                            {0.0f, 0x1p-126},    {-0.0f, 0x1p-126}, {kNaNf, 0x1p127},
                                            {kInff, 0x1p127},    {-kInff, 0x1p127}, {FLT_MAX, 0x1p127},
                                            {-FLT_MAX, 0x1p127}, {above, 0x1p127}};
  for (const auto &[M, P] : cases)
  {
    Arith a;
    EXPECT_EQ(a.SetMaxCoord(M), E_INVALIDARG) << Hex(M);
    EXPECT_TRUE(GridBound(a) == P && (std::isnan(M) ? std::isnan(a.GetMaxCoord()) : Bits(a.GetMaxCoord()) == Bits(M)))
        << Hex(M);
  }
}

// On every grid, valid or a fallback: Normalize and Grid round to the nearest multiple of 2ε.
TEST(RKMPolyExactArithmeticSnap, MatchesNearestEvenMultipleOfTwoEpsilon)
{
  const float maxima[] = {1.0f,      0.75f,  3.0f,    100000.0f,  1e-3f,    0x1p-100f, 0x1p-126f,
                          0x1p-130f, 1e-45f, 0x1p60f, 0x1.8p100f, 0x1p127f, 0.0f,      kNaNf,
                          -0.0f,     kInff,  -kInff,  FLT_MAX,    -3.0f};
  const std::uint64_t seed = 0x5eed0004;
  std::mt19937_64 rng(seed);
  for (const float M : maxima)
  {
    Arith a;
    a.SetMaxCoord(M);
    for (int i = 0; i < 16000; ++i)
    {
      const float v = RandomFloatUpTo(rng, GridBound(a));
      ASSERT_EQ(static_cast<double>(Snapped(a, v)), ReferenceSnap(v, a.GetCoordinatePrecision()))
          << "seed " << seed << " M " << Hex(M) << " v " << Hex(v) << " case " << i;
      ASSERT_EQ(Bits(Gridded(a, v)), Bits(Snapped(a, v)));
    }
  }
}

// ±P stay; anything beyond, up to infinity, goes out of range.
TEST(RKMPolyExactArithmeticSnap, BoundsAndBeyond)
{
  for (const float M : {1.0f, 100000.0f, 0x1p-126f, 0x1p127f})
  {
    Arith a;
    a.SetMaxCoord(M);
    const float P = static_cast<float>(GridBound(a));
    EXPECT_TRUE(Snapped(a, P) == P && Snapped(a, -P) == -P && InRange(a, P) == 3 && InRange(a, -P) == 3) << Hex(M);
    for (const float out : {std::nextafter(P, kInff), 2.0f * P, FLT_MAX, kInff})
    {
      EXPECT_TRUE(Snapped(a, out) == kOutOfRange && std::fabs(Snapped(a, -out)) == kOutOfRange) << Hex(out);
      EXPECT_EQ(InRange(a, out) + InRange(a, -out), 0) << Hex(out);
    }
  }
}

// Ties go to even multiples; a double is rounded to float before snapping, which can turn a value
// just above a tie into the tie itself.
TEST(RKMPolyExactArithmeticSnap, TiesGoToEvenAndDoublesRoundToFloatFirst)
{
  Arith a;
  a.SetMaxCoord(1.0f);
  const double u = 0x1p-22;
  const double ties[][2] = {{0.5 * u, 0.0},     {1.5 * u, 2.0 * u}, {2.5 * u, 2.0 * u},   {-0.5 * u, 0.0},
                            {-1.5 * u, -2 * u}, {-2.5 * u, -2 * u}, {0.5 + 0.5 * u, 0.5}, {0.5 + 1.5 * u, 0.5 + 2 * u}};
  for (const auto &t : ties)
    EXPECT_EQ(static_cast<double>(Snapped(a, static_cast<float>(t[0]))), t[1]) << Hex(t[0]);
  EXPECT_EQ(Snapped(a, 0.5 + 0x1p-23 + 0x1p-40), 0.5);
  const std::uint64_t seed = 0x5eed0005;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> uniform(-1.0, 1.0);
  for (int i = 0; i < 5000; ++i)
  {
    const double v = uniform(rng);
    ASSERT_EQ(Snapped(a, v), ReferenceSnap(static_cast<float>(v), a.GetCoordinatePrecision()))
        << "seed " << seed << " v " << Hex(v);
  }
}

// Adaptive and unknown modes normalise nothing; Grid snaps whatever the mode.
TEST(RKMPolyExactArithmeticSnap, OnlyTheGriddedModeNormalizes)
{
  for (const Mode mode : {Arith::Adaptive, Arith::Adaptive2, static_cast<Mode>(7)})
  {
    Arith a(mode);
    EXPECT_EQ(a.GetMode(), mode);
    ASSERT_EQ(a.SetMaxCoord(1000.005f), S_OK);
    EXPECT_TRUE(a.GetMaxNormalizedCoord() == 1000.005f && Snapped(a, 1.01f) == 1.01f && Snapped(a, 0.1) == 0.1 &&
                Snapped(a, 1e6) == 1e6 && Snapped(a, RKMMathPoint(0.1, 0.2, 0.3)) == RKMMathPoint(0.1, 0.2, 0.3) &&
                Snapped(a, RKMMathPoint2D(0.1, 0.2)) == RKMMathPoint2D(0.1, 0.2))
        << mode;
    a.SetMaxCoord(100000.0f);
    EXPECT_EQ(Gridded(a, 1.01f), 1.0f) << mode;
  }
  Arith g;
  g.SetMaxCoord(1000.005f);
  EXPECT_EQ(static_cast<double>(g.GetMaxNormalizedCoord()), ReferenceSnap(1000.005f, g.GetCoordinatePrecision()));
  EXPECT_NE(g.GetMaxNormalizedCoord(), 1000.005f);
}

TEST(RKMPolyExactArithmeticCompare, ScalarsPointsAndNaN)
{
  const Arith a;
  const double next = std::nextafter(1.0, 2.0);
  const double cases[][4] = {{1, 2, -1, 0},   {2, 1, 1, 0},     {2, 2, 0, 1},
                             {0, -0.0, 0, 1}, {1, next, -1, 0}, {-kInf, kInf, -1, 0},
                             {kNaN, 1, 0, 0}, {1, kNaN, 0, 0},  {kNaN, kNaN, 0, 0}};
  for (const auto &c : cases)
    EXPECT_TRUE(a.Compare(c[0], c[1]) == c[2] && a.Equal(c[0], c[1]) == c[3]) << c[0] << " vs " << c[1];
  // A point differs from another in any one coordinate, and a NaN coordinate equals nothing.
  for (int k = 0; k < 3; ++k)
  {
    RKMMathPoint p(1, 2, 3), moved = p, withNaN = p;
    moved[k] += 1.0;
    withNaN[k] = kNaN;
    EXPECT_TRUE(a.Equal(p, p) && !a.Equal(p, moved) && !a.Equal(withNaN, withNaN)) << k;
    const RKMMathPoint2D p2(p.x, p.y), moved2(moved.x, moved.y), withNaN2(withNaN.x, withNaN.y);
    EXPECT_TRUE(k == 2 || (a.Equal(p2, p2) && !a.Equal(p2, moved2) && !a.Equal(withNaN2, withNaN2))) << k;
  }
}

// Lexicographic, x first or the height first; NaN keys count as equal, so the next key decides.
TEST(RKMPolyExactArithmeticCompare, LexicographicOrders)
{
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint2D(kNaN, 1), RKMMathPoint2D(0, 2)), -1);
  EXPECT_EQ(RKMPolyCompareBelowAbove(RKMMathPoint2D(3, kNaN), RKMMathPoint2D(1, 0)), 1);
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint2D(kNaN, kNaN), RKMMathPoint2D(0, 2)), 0);
  EXPECT_EQ(RKMPolyCompareLeftRight(RKMMathPoint(1, kNaN, 0), RKMMathPoint(1, 5, 1)), -1);
  EXPECT_EQ(RKMPolyCompareBelowAbove(RKMMathPoint(1, 0, kNaN), RKMMathPoint(0, 0, 5)), 1);
  const std::uint64_t seed = 0x5eed0006;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-1, 1);
  const Arith a;
  auto sign = [](auto l, auto r) { return l < r ? -1 : (r < l ? 1 : 0); };
  for (int i = 0; i < 2000; ++i)
  {
    const RKMMathPoint p(c(rng), c(rng), c(rng)), q(c(rng), c(rng), c(rng));
    const RKMMathPoint2D p2(p.x, p.y), q2(q.x, q.y);
    SCOPED_TRACE(testing::Message() << "seed " << seed << " case " << i);
    ASSERT_EQ(RKMPolyCompareLeftRight(p, q), sign(std::tie(p.x, p.y, p.z), std::tie(q.x, q.y, q.z)));
    ASSERT_EQ(RKMPolyCompareBelowAbove(p, q), sign(std::tie(p.z, p.y, p.x), std::tie(q.z, q.y, q.x)));
    ASSERT_EQ(a.CompareLeftRight(p2, q2), sign(std::tie(p2.x, p2.y), std::tie(q2.x, q2.y)));
    ASSERT_EQ(a.CompareBelowAbove(p2, q2), sign(std::tie(p2.y, p2.x), std::tie(q2.y, q2.x)));
  }
}

namespace
{
std::array<double, 4> LimitsOf(const RKMMathBox2D &b)
{
  std::array<double, 4> l{};
  EXPECT_EQ(b.GetLimits(l[0], l[1], l[2], l[3]), S_OK);
  return l;
}
std::array<double, 6> LimitsOf(const RKMMathBox &b)
{
  std::array<double, 6> l{};
  b.GetExtremities(l[0], l[1], l[2], l[3], l[4], l[5]);
  return l;
}
template <std::size_t N> bool SameBits(const std::array<double, N> &a, const std::array<double, N> &b)
{
  return std::memcmp(a.data(), b.data(), sizeof a) == 0;
}
} // namespace

// The largest absolute limit; empty boxes fail with 0.
TEST(RKMPolyMathGeoUtil, MaximumCoordinate)
{
  double m = 7.0, m2 = 7.0;
  EXPECT_TRUE(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox(), m) == E_FAIL && m == 0.0);
  EXPECT_TRUE(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox2D(), m2) == E_FAIL && m2 == 0.0);
  const std::pair<RKMMathBox, double> boxes[] = {
      {{-5, 3, 1, 2, 0, 4}, 5.0}, {{1, 2, 1, 2, -3, 6.5}, 6.5}, {{0, 1, kNaN, 1, 0, 1}, kInf}};
  for (const auto &[box, max] : boxes)
    EXPECT_TRUE(RKMPolyMathGeoUtil::GetMaximumCoordinate(box, m) == S_OK && m == max) << max;
  EXPECT_TRUE(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox2D(-1, 0.5, -9, -8), m) == S_OK && m == 9.0);
  EXPECT_TRUE(RKMPolyMathGeoUtil::GetMaximumCoordinate(RKMMathBox2D(0, 0, 0, 0), m) == S_OK && m == 0.0);
}

TEST(RKMPolyNormalizeUtils, NormalizeBoxSnapsLimitsInGriddedMode)
{
  const Arith a;
  const double eps = a.GetCoordinatePrecision();
  RKMMathBox2D b2(-1.01, 1.02, 0.1, 131072.0);
  EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b2), S_OK);
  EXPECT_EQ(LimitsOf(b2), (std::array<double, 4>{-1.0, 1.03125, 0.09375, 131072.0}));
  const std::uint64_t seed = 0x5eed0007;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-131072.0, 131072.0);
  for (int i = 0; i < 2000; ++i)
  {
    std::array<double, 6> lim;
    for (int k = 0; k < 6; k += 2)
    {
      lim[k] = u(rng);
      lim[k + 1] = u(rng);
      if (lim[k] > lim[k + 1])
        std::swap(lim[k], lim[k + 1]);
    }
    RKMMathBox b(lim[0], lim[1], lim[2], lim[3], lim[4], lim[5]);
    ASSERT_EQ(RKMPolyNormalizeUtils::Normalize(a, b), S_OK) << "seed " << seed << " case " << i;
    for (int k = 0; k < 6; ++k)
      ASSERT_EQ(LimitsOf(b)[k], ReferenceSnap(static_cast<float>(lim[k]), eps)) << "seed " << seed << " case " << i;
  }
}

// A limit off the grid refuses the whole box and leaves it as it was; adaptive modes accept all.
TEST(RKMPolyNormalizeUtils, NormalizeBoxRefusesLimitsOffTheGridButNotInAdaptiveModes)
{
  const Arith a, adaptive(Arith::Adaptive), adaptive2(Arith::Adaptive2);
  for (const double v : {200000.0, -131073.0, kInf, -kInf, kNaN, 1e300})
  {
    const bool high = v > 0 || std::isnan(v);
    RKMMathBox b(0.1, high ? v : 1.0, high ? 0.1 : v, 1.0, 0.1, 1.0);
    RKMMathBox2D b2(0.1, 1.0, high ? 0.1 : v, high ? v : 1.0);
    const auto before = LimitsOf(b);
    const auto before2 = LimitsOf(b2);
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b), E_FAIL) << v;
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(a, b2), E_FAIL) << v;
    EXPECT_TRUE(SameBits(before, LimitsOf(b)) && SameBits(before2, LimitsOf(b2))) << v;
  }
  RKMMathBox empty;
  RKMMathBox2D empty2;
  EXPECT_TRUE(RKMPolyNormalizeUtils::Normalize(a, empty) == E_FAIL &&
              RKMPolyNormalizeUtils::Normalize(a, empty2) == E_FAIL);
  EXPECT_TRUE(empty.IsEmpty() && empty2.IsEmpty());
  for (const Arith *other : {&adaptive, &adaptive2})
  {
    RKMMathBox b(-1.01, 200000.0, 0.1, kInf, -kInf, 0.3);
    RKMMathBox2D b2(-1.01, 1.02, 0.1, 3e5);
    const auto before = LimitsOf(b);
    EXPECT_TRUE(RKMPolyNormalizeUtils::Normalize(*other, b) == S_OK && SameBits(before, LimitsOf(b)));
    EXPECT_EQ(RKMPolyNormalizeUtils::Normalize(*other, b2), S_OK);
    EXPECT_EQ(LimitsOf(b2), (std::array<double, 4>{-1.01, 1.02, 0.1, 3e5}));
  }
}

// A new gridded arithmetic is made for the box, or the given one reconfigured, with M the largest
// absolute limit; the box is snapped to the grid unless the arithmetic is adaptive. A box at the
// origin gets the finest grid, and it works.
TEST(RKMPolyNormalizeUtils, NormalizeBoundingBoxSetsTheGridUp)
{
  RKMMathBox b(-1.01, 3.3, 0.1, 2.0, -700.2, 5.0), c(-1.01, 3.3, 0.1, 2.0, -7.2, 5.0), origin(0, 0, 0, 0, 0, 0);
  RKMMathBox2D b2(-1.01, 3.3, 0.1, 2.5), origin2(0, 0, 0, 0);
  RKMPolyExactArithmetic *a = nullptr, *a2 = nullptr, *tiny = nullptr, *tiny2 = nullptr;
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), S_OK);
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b2, a2), S_OK);
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(origin, tiny), S_OK);
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(origin2, tiny2), S_OK);
  const std::unique_ptr<Arith> owned[] = {std::unique_ptr<Arith>(a), std::unique_ptr<Arith>(a2),
                                          std::unique_ptr<Arith>(tiny), std::unique_ptr<Arith>(tiny2)};
  ASSERT_TRUE(a && a2 && tiny && tiny2);
  EXPECT_TRUE(a->GetMode() == Arith::Gridded && a->GetMaxCoord() == 700.2f && GridBound(*a) == 1024.0);
  const double original[] = {-1.01, 3.3, 0.1, 2.0, -700.2, 5.0};
  for (int k = 0; k < 6; ++k)
    EXPECT_EQ(LimitsOf(b)[k], ReferenceSnap(static_cast<float>(original[k]), a->GetCoordinatePrecision())) << k;
  EXPECT_TRUE(a2->GetMaxCoord() == 3.3f && GridBound(*a2) == 4.0);
  EXPECT_EQ(LimitsOf(b2)[0], ReferenceSnap(static_cast<float>(-1.01), a2->GetCoordinatePrecision()));
  EXPECT_TRUE(tiny->GetMaxCoord() == 0.0f && GridBound(*tiny) == 0x1p-126 && GridBound(*tiny2) == 0x1p-126);
  EXPECT_TRUE(LimitsOf(origin) == (std::array<double, 6>{}) && Snapped(*tiny, 0.0f) == 0.0f);
  const double p[] = {0, 0}, q[] = {0x1p-140, 0}, r[] = {0, 0x1p-140};
  EXPECT_TRUE(tiny->Orientation2D(p, q, r) == 1 && tiny->Orientation2D(p, r, q) == -1);

  Arith adaptive(Arith::Adaptive);
  RKMPolyExactArithmetic *given = &adaptive;
  const auto before = LimitsOf(c);
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(c, given), S_OK);
  EXPECT_TRUE(given == &adaptive && adaptive.GetMode() == Arith::Adaptive && adaptive.GetMaxCoord() == 7.2f);
  EXPECT_TRUE(GridBound(adaptive) == 8.0 && SameBits(before, LimitsOf(c)));
}

// Empty or non-finite boxes fail, and leave the box and any given arithmetic as they were.
TEST(RKMPolyNormalizeUtils, NormalizeBoundingBoxRefusesUnusableBoxes)
{
  RKMMathBox empty;
  RKMMathBox2D empty2;
  RKMPolyExactArithmetic *a = nullptr;
  EXPECT_TRUE(RKMPolyNormalizeUtils::NormalizeBoundingBox(empty, a) == E_FAIL &&
              RKMPolyNormalizeUtils::NormalizeBoundingBox(empty2, a) == E_FAIL && a == nullptr);
  for (const double bad : {kInf, kNaN, 1e300})
  {
    RKMMathBox b(0, 1, 0, bad, 0, 1);
    RKMMathBox2D b2(-bad, 0, 0, 1);
    const auto before = LimitsOf(b);
    EXPECT_TRUE(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a) == E_FAIL &&
                RKMPolyNormalizeUtils::NormalizeBoundingBox(b2, a) == E_FAIL && a == nullptr)
        << bad;
    delete a;
    Arith existing;
    existing.SetMaxCoord(5.0f);
    a = &existing;
    EXPECT_EQ(RKMPolyNormalizeUtils::NormalizeBoundingBox(b, a), E_FAIL) << bad;
    EXPECT_TRUE(a == &existing && existing.GetMaxCoord() == 5.0f && GridBound(existing) == 8.0) << bad;
    EXPECT_TRUE(SameBits(before, LimitsOf(b))) << bad;
    a = nullptr;
  }
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
    std::vector<RKMMathPoint> pts(n);
    double maxAbs = 0.0;
    RKMMathBox expected;
    for (auto &p : pts)
    {
      p = RKMMathPoint(coord(), coord(), coord());
      maxAbs = std::max({maxAbs, std::fabs(p.x), std::fabs(p.y), std::fabs(p.z)});
      expected.AddInside(p);
    }
    const std::vector<RKMMathPoint> orig = pts;
    RKMMathBox box(-5, 5, -5, 5, -5, 5);
    RKMPolyExactArithmetic *a = nullptr;
    const HRESULT hr = RKMPolyNormalizeUtils::NormalizePoints(pts.data(), n, box, a);
    const std::unique_ptr<Arith> owned(a);
    if (maxAbs == 0.0)
      continue;
    ASSERT_TRUE(hr == S_OK && a && a->GetMaxCoord() == static_cast<float>(maxAbs));
    const double eps = a->GetCoordinatePrecision();
    for (int k = 0; k < 6; ++k)
      ASSERT_EQ(LimitsOf(box)[k], ReferenceSnap(LimitsOf(expected)[k], eps)) << k;
    for (int i = 0; i < n; ++i)
    {
      for (int k = 0; k < 3; ++k)
        ASSERT_EQ(pts[i][k], ReferenceSnap(orig[i][k], eps)) << i << "," << k;
      ASSERT_TRUE(box.IsContaining(pts[i]));
    }
  }
}

TEST(RKMPolyNormalizeUtils, NormalizePoints2DReusesAnArithmetic)
{
  RKMMathPoint2D pts[] = {{1.01, -2.0}, {0.1, 3.7}, {-3.2, 0.0}};
  Arith existing;
  RKMPolyExactArithmetic *a = &existing;
  RKMMathBox2D box;
  ASSERT_EQ(RKMPolyNormalizeUtils::NormalizePoints(pts, 3, box, a), S_OK);
  const double eps = existing.GetCoordinatePrecision();
  EXPECT_TRUE(a == &existing && existing.GetMaxCoord() == 3.7f && eps == 0x1p-21);
  EXPECT_TRUE(pts[0].x == ReferenceSnap(1.01f, eps) && pts[1].x == ReferenceSnap(0.1f, eps) &&
              pts[1].y == ReferenceSnap(3.7f, eps));
  EXPECT_EQ(LimitsOf(box), (std::array<double, 4>{ReferenceSnap(-3.2f, eps), pts[0].x, -2.0, pts[1].y}));
}

// Null points fail as invalid; no points give an empty box and no arithmetic; a NaN coordinate
// fails before any point moves or any arithmetic changes.
TEST(RKMPolyNormalizeUtils, NormalizePointsRejectsBadInput)
{
  RKMMathBox box(0, 1, 0, 1, 0, 1);
  RKMMathBox2D box2(0, 1, 0, 1);
  RKMPolyExactArithmetic *a = nullptr;
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(static_cast<RKMMathPoint *>(nullptr), 3, box, a), E_INVALIDARG);
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(static_cast<RKMMathPoint2D *>(nullptr), 1, box2, a), E_INVALIDARG);
  RKMMathPoint one(1, 2, 3);
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(&one, 0, box, a), E_FAIL);
  EXPECT_EQ(RKMPolyNormalizeUtils::NormalizePoints(static_cast<RKMMathPoint2D *>(nullptr), 0, box2, a), E_FAIL);
  EXPECT_TRUE(box.IsEmpty() && box2.IsEmpty() && one == RKMMathPoint(1, 2, 3) && a == nullptr);
  RKMMathPoint withNaN[] = {{1.01, 2, 3}, {kNaN, 0.1, 0}};
  EXPECT_TRUE(FAILED(RKMPolyNormalizeUtils::NormalizePoints(withNaN, 2, box, a)) && a == nullptr);
  delete a;
  EXPECT_TRUE(withNaN[0] == RKMMathPoint(1.01, 2, 3) && withNaN[1].y == 0.1);
  RKMMathPoint2D withNaN2[] = {{1.01, 2}, {0.1, kNaN}};
  Arith existing;
  a = &existing;
  EXPECT_TRUE(FAILED(RKMPolyNormalizeUtils::NormalizePoints(withNaN2, 2, box2, a)));
  EXPECT_TRUE(a == &existing && existing.GetMaxCoord() == 100000.0f && withNaN2[0].x == 1.01 && withNaN2[1].x == 0.1);
}
