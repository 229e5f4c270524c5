#include "RKMPolyBoxf.h"

#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMMathPointf.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cfloat>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <iterator>
#include <limits>
#include <random>
#include <string>
#include <utility>

namespace
{
constexpr float kInfF = std::numeric_limits<float>::infinity(), kNaNF = std::numeric_limits<float>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity(), kNaN = std::numeric_limits<double>::quiet_NaN();
using Order = RKMPolyBoxf::IntersectionTestOrder;

std::uint32_t Bits(float f)
{
  std::uint32_t i;
  std::memcpy(&i, &f, sizeof i);
  return i;
}
float Down(float f) { return std::nextafterf(f, -kInfF); }
float Up(float f) { return std::nextafterf(f, kInfF); }

// Largest float <= v (and smallest >= v), found without the library's conversion and without the
// undefined out-of-range cast.
float FloorF(double v)
{
  if (v >= FLT_MAX)
    return v == kInf ? kInfF : FLT_MAX;
  if (v < -FLT_MAX)
    return -kInfF;
  const float f = static_cast<float>(v);
  return static_cast<double>(f) > v ? Down(f) : f;
}
float CeilF(double v) { return -FloorF(-v); }

void Bounds(const RKMPolyBoxf &b, float lo[3], float hi[3])
{
  lo[0] = b.GetXMin(), lo[1] = b.GetYMin(), lo[2] = b.GetZMin();
  hi[0] = b.GetXMax(), hi[1] = b.GetYMax(), hi[2] = b.GetZMax();
}
bool SameBits(const RKMPolyBoxf &a, const RKMPolyBoxf &b) { return std::memcmp(&a, &b, sizeof a) == 0; }

// A double-derived bound must enclose the value, but by no more than two float steps, so that "make it
// infinite" cannot pass for correct rounding. A NaN value must leave the side open.
void ExpectEncloses(const RKMPolyBoxf &b, const double lo[3], const double hi[3])
{
  float fl[3], fh[3];
  Bounds(b, fl, fh);
  for (int i = 0; i < 3; ++i)
  {
    ASSERT_FALSE(std::isnan(fl[i]) || std::isnan(fh[i])) << "axis " << i;
    EXPECT_TRUE(std::isnan(lo[i]) ? fl[i] == -kInfF : double(fl[i]) <= lo[i] && fl[i] >= Down(Down(FloorF(lo[i]))))
        << "axis " << i << " min " << fl[i] << " for " << lo[i];
    EXPECT_TRUE(std::isnan(hi[i]) ? fh[i] == kInfF : double(fh[i]) >= hi[i] && fh[i] <= Up(Up(CeilF(hi[i]))))
        << "axis " << i << " max " << fh[i] << " for " << hi[i];
  }
}

// Magnitudes from subnormal to beyond the float range, both signs, with exact floats, ties halfway
// between floats, and the edges of the float range (including just short of the overflow point).
double RandomDouble(std::mt19937_64 &rng)
{
  static const double kEdgeValues[] = {0.0,     4.9e-324, 1e-310,           FLT_TRUE_MIN,    1.0,
                                       FLT_MAX, DBL_MAX,  0x1.fffffe8p+127, 0x1.ffffffp+127, 0x1.fffffefffffffp+127,
                                       1e39,    kInf};
  const int kind = std::uniform_int_distribution<int>(0, 9)(rng);
  const double sign = std::uniform_int_distribution<int>(0, 1)(rng) ? 1.0 : -1.0;
  if (kind == 0)
    return sign * kEdgeValues[std::uniform_int_distribution<std::size_t>(0, std::size(kEdgeValues) - 1)(rng)];
  const double mag = std::pow(10.0, std::uniform_real_distribution<double>(-325.0, 41.0)(rng));
  if (kind == 1 && mag < FLT_MAX)
    return sign * static_cast<float>(mag);
  if (kind == 2 && mag < 1e38)
    return sign * (0.5 * static_cast<float>(mag) + 0.5 * Up(static_cast<float>(mag)));
  return sign * mag;
}

RKMMathBox RandomBox(std::mt19937_64 &rng, double lo[3], double hi[3])
{
  for (int i = 0; i < 3; ++i)
  {
    lo[i] = RandomDouble(rng), hi[i] = RandomDouble(rng);
    if (hi[i] < lo[i])
      std::swap(lo[i], hi[i]);
  }
  return RKMMathBox(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]);
}

// Whether a + b >= c holds exactly rather than after rounding the sum (finite values), by the two-sum
// rounding error.
bool SumAtLeast(double a, double b, double c)
{
  const double s = a + b, bv = s - a, err = (a - (s - bv)) + (b - bv);
  return s > c || (s == c && err >= 0.0);
}
} // namespace

// Built from doubles in three ways, grown point by point and box by box (only the bounds that move get
// stepped), or inflated, the box encloses the geometry tightly.
TEST(RKMPolyBoxfEnclosure, RandomDoubleGeometryIsEnclosedTightly)
{
  std::mt19937_64 rng(20240611u);
  for (int iter = 0; iter < 3000; ++iter)
  {
    SCOPED_TRACE("seed 20240611, iteration " + std::to_string(iter));
    double lo[3], hi[3];
    const RKMMathBox m = RandomBox(rng, lo, hi);
    RKMPolyBoxf viaSet(1.0f, 2.0f, 1.0f, 2.0f, 1.0f, 2.0f), points, boxes, inflated(m);
    viaSet.SetBox(m);
    for (const RKMPolyBoxf &b : {RKMPolyBoxf(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]), RKMPolyBoxf(m), viaSet})
      ExpectEncloses(b, lo, hi);
    double plo[3] = {kInf, kInf, kInf}, phi[3] = {-kInf, -kInf, -kInf}, blo[3] = {kInf, kInf, kInf},
           bhi[3] = {-kInf, -kInf, -kInf};
    for (int k = 0; k < 4; ++k)
    {
      const RKMMathPoint p(RandomDouble(rng), RandomDouble(rng), RandomDouble(rng));
      double l[3], h[3];
      points.AddInside(p);
      boxes.AddInside(RandomBox(rng, l, h));
      EXPECT_TRUE(points.IsContaining(p));
      for (int i = 0; i < 3; ++i)
      {
        plo[i] = std::min(plo[i], p[i]), phi[i] = std::max(phi[i], p[i]);
        blo[i] = std::min(blo[i], l[i]), bhi[i] = std::max(bhi[i], h[i]);
      }
      ExpectEncloses(points, plo, phi);
      ExpectEncloses(boxes, blo, bhi);
    }
    // Inflated, it holds the inflated math box and stays near its float bounds moved by d.
    const double d = RandomDouble(rng);
    float bl[3], bh[3];
    Bounds(inflated, bl, bh);
    RKMMathBox mInflated = m;
    mInflated.Inflate(d);
    inflated.Inflate(d);
    const double tlo[3] = {bl[0] - d, bl[1] - d, bl[2] - d}, thi[3] = {bh[0] + d, bh[1] + d, bh[2] + d};
    ExpectEncloses(inflated, tlo, thi);
    EXPECT_TRUE(mInflated.IsEmpty() ||
                (inflated.IsContaining(mInflated.GetLow()) && inflated.IsContaining(mInflated.GetHigh())))
        << "d " << d;
  }
  // A bound and a distance that nearly cancel: rounding d to float before moving the bound would lose
  // more than the final step at the small result covers.
  const double a = 1.0 - 0x1p-25 + 0x1p-40, d = 1.0 + 0x1p-24 - 0x1p-40;
  RKMMathBox m(a, 2.0, a, 2.0, a, 2.0);
  RKMPolyBoxf b(m), unit(1.0f, 1.0f, 1.0f, 1.0f, 1.0f, 1.0f);
  m.Inflate(d);
  b.Inflate(d);
  unit.Inflate(1.0 + 1e-9);
  EXPECT_TRUE(b.IsContaining(m.GetLow()));
  EXPECT_LE(unit.GetXMin(), -1e-9);
}

// Every way to an empty box gives the same six values, whatever the box held before, and an empty box
// answers nothing. Bounds from doubles are stepped outward, from floats kept.
TEST(RKMPolyBoxfValues, CanonicalEmptyAndExactBitPatterns)
{
  const RKMPolyBoxf b(0.0, 1.0, 0.0, 1.0, 0.0, 1.0), negZero(-0.0, -0.0, 0.0, 0.0, 0.0, 0.0);
  EXPECT_TRUE(Bits(b.GetXMin()) == 0x80000001u && Bits(b.GetXMax()) == 0x3F800001u);
  EXPECT_TRUE(Bits(negZero.GetXMin()) == 0x80000001u && Bits(negZero.GetXMax()) == 0x00000001u);
  const RKMPolyBoxf f(0.0f, 1.0f, 0.0f, 1.0f, 0.0f, 1.0f), inverted(2.0f, 1.0f, 5.0f, 6.0f, 7.0f, 8.0f);
  EXPECT_TRUE(Bits(f.GetXMin()) == 0u && Bits(f.GetZMax()) == 0x3F800000u);
  // Pointers, because copying is itself one of the ways.
  const RKMPolyBoxf byDefault, fromMath{RKMMathBox()}, copied(inverted);
  RKMPolyBoxf cleared(f), fromEmpty(f);
  cleared.SetToEmpty();
  fromEmpty.SetBox(RKMMathBox());
  for (const RKMPolyBoxf *x : {&byDefault, &fromMath, &copied, &std::as_const(cleared), &std::as_const(fromEmpty)})
  {
    const RKMPolyBoxf &e = *x;
    float fl[3], fh[3], fo[6] = {7, 7, 7, 7, 7, 7};
    double dout[6] = {7, 7, 7, 7, 7, 7};
    Bounds(e, fl, fh);
    for (int i = 0; i < 3; ++i)
      EXPECT_TRUE(Bits(fl[i]) == 0x3F800000u && Bits(fh[i]) == 0xBF800000u);
    EXPECT_TRUE(e.IsEmpty() && e.Volume() == 0.0);
    EXPECT_LT(e.GetLimits(fo[0], fo[1], fo[2], fo[3], fo[4], fo[5]), 0);
    EXPECT_EQ(e.GetLimits(dout[0], dout[1], dout[2], dout[3], dout[4], dout[5]), E_FAIL);
    EXPECT_TRUE(std::all_of(fo, fo + 6, [](float v) { return v == 7; }) &&
                std::all_of(dout, dout + 6, [](double v) { return v == 7; }));
  }
  EXPECT_EQ(RKMPolyBoxf(0.0f, 1.0f, 0.0f, 2.0f, 0.0f, 3.0f).Volume(), 6.0);
}

TEST(RKMPolyBoxfValues, AddInsideUnionAndInflateOnExactValues)
{
  RKMPolyBoxf p, q, u;
  p.AddInside(RKMMathPoint(2.0, 2.0, 2.0));
  EXPECT_TRUE(p.GetXMin() == Down(2.0f) && p.GetZMax() == Up(2.0f));
  const RKMPolyBoxf once = p;
  p.AddInside(RKMMathPoint(2.0, 2.0, 2.0));
  EXPECT_TRUE(SameBits(once, p)) << "a point already held changes nothing";
  q.AddInside(RKMMathPointf(0.1f, -3.0f, 1e-40f));
  EXPECT_TRUE(q.GetXMin() == 0.1f && q.GetXMax() == 0.1f && q.GetYMin() == -3.0f && q.GetZMax() == 1e-40f);
  // On equal bounds the first box wins, which the sign of zero makes visible.
  const RKMPolyBoxf a(0.0f, 1.0f, 0.0f, 1.0f, 0.0f, 1.0f), b(-0.0f, 1.0f, 0.0f, 2.0f, -1.0f, 0.5f), empty;
  u.SetToUnion(empty, empty);
  EXPECT_TRUE(u.IsEmpty());
  for (const RKMPolyBoxf *x : {&a, &b})
  {
    u.SetToUnion(*x, empty);
    EXPECT_TRUE(SameBits(u, *x));
    u.SetToUnion(empty, *x);
    EXPECT_TRUE(SameBits(u, *x));
  }
  u.SetToUnion(a, b);
  EXPECT_TRUE(Bits(u.GetXMin()) == 0u && u.GetYMax() == 2.0f && u.GetZMin() == -1.0f && u.GetZMax() == 1.0f);
  u.SetToUnion(b, a);
  EXPECT_EQ(Bits(u.GetXMin()), 0x80000000u);
  // Inflating by 0 still steps every bound outward.
  RKMPolyBoxf g(1.0f, 2.0f, -3.0f, 0.0f, 1e-30f, FLT_MAX);
  g.Inflate(0.0);
  EXPECT_TRUE(g.GetXMin() == Down(1.0f) && g.GetXMax() == Up(2.0f) && g.GetYMin() == Down(-3.0f));
  EXPECT_TRUE(Bits(g.GetYMax()) == 0x00000001u && g.GetZMin() == Down(1e-30f) && g.GetZMax() == kInfF);
}

TEST(RKMPolyBoxfValues, InfinityAndNaNNeverLoseGeometry)
{
  const RKMPolyBoxf big(-1e39, 1e39, -DBL_MAX, DBL_MAX, -kInf, static_cast<double>(FLT_MAX));
  float bl[3], bh[3];
  Bounds(big, bl, bh);
  for (int i = 0; i < 3; ++i)
    EXPECT_TRUE(bl[i] == -kInfF && bh[i] == kInfF) << i;
  // Just past the largest float but short of where rounding reaches infinity: the min stays finite.
  const RKMPolyBoxf edge(0x1.fffffe8p+127, 0x1.fffffe8p+127, -0x1.fffffe8p+127, 0.0, 0.0, 0.0);
  EXPECT_TRUE(edge.GetXMin() == Down(FLT_MAX) && edge.GetXMax() == kInfF && edge.GetYMin() == -kInfF);
  for (double d : {0.0, 1.0, -1.0, 1e39, -1e39, kInf, -kInf})
  {
    RKMPolyBoxf inf(-kInfF, kInfF, -kInfF, kInfF, -kInfF, kInfF);
    inf.Inflate(d);
    EXPECT_TRUE(inf.GetXMin() == -kInfF && inf.GetYMax() == kInfF) << "d " << d;
  }
  // A NaN bound, coordinate or distance opens its side(s) instead of poisoning comparisons.
  RKMPolyBoxf f(kNaNF, 1.0f, 0.0f, kNaNF, 0.0f, 1.0f), s, dn(kNaN, 1.0, 0.0, kNaN, 0.0, 1.0),
      n(0.0f, 1.0f, 0.0f, 1.0f, 0.0f, 1.0f);
  s.SetExtremities(0.0f, 1.0f, kNaNF, kNaNF, 0.0f, 1.0f);
  EXPECT_TRUE(f.GetXMin() == -kInfF && f.GetYMax() == kInfF && f.GetXMax() == 1.0f);
  EXPECT_TRUE(s.GetYMin() == -kInfF && s.GetYMax() == kInfF && s.GetZMax() == 1.0f);
  EXPECT_TRUE(dn.GetXMin() == -kInfF && dn.GetYMax() == kInfF && dn.GetXMax() == Up(1.0f));
  for (bool startEmpty : {true, false})
  {
    RKMPolyBoxf p, pf;
    if (!startEmpty)
      p = pf = n;
    p.AddInside(RKMMathPoint(0.5, kNaN, 0.5));
    pf.AddInside(RKMMathPointf(0.5f, kNaNF, 0.5f));
    for (const RKMPolyBoxf &x : {p, pf})
      EXPECT_TRUE(x.GetYMin() == -kInfF && x.GetYMax() == kInfF && !x.IsEmpty() &&
                  x.IsContaining(RKMMathPoint(0.5, 1e300, 0.5)))
          << startEmpty;
  }
  n.Inflate(kNaN);
  Bounds(n, bl, bh);
  for (int i = 0; i < 3; ++i)
    EXPECT_TRUE(bl[i] == -kInfF && bh[i] == kInfF) << i;
  const RKMPolyBoxf near(0.0f, 1.0f, 0.0f, 1.0f, 0.0f, 1.0f), far(5.0f, 6.0f, 5.0f, 6.0f, 5.0f, 6.0f);
  EXPECT_TRUE(near.IsIntersecting(far, kNaNF) && near.FastIsIntersecting(far, kNaNF) &&
              near.IsIntersecting(RKMMathBox(5, 6, 5, 6, 5, 6), kNaN));
}

TEST(RKMPolyBoxfOverlap, EdgeCasesAndMathBoxToleranceRounding)
{
  const RKMPolyBoxf unit(0.0f, 1.0f, 0.0f, 1.0f, 0.0f, 1.0f), neighbour(1.0f, 2.0f, 0.0f, 1.0f, 0.0f, 1.0f), empty,
      wide(-2.0f, 2.0f, -2.0f, 2.0f, -2.0f, 2.0f);
  EXPECT_TRUE(unit.IsIntersecting(neighbour, 0.0f) && wide.FastIsIntersecting(empty));
  EXPECT_FALSE(wide.IsIntersecting(empty, 0.0f) || empty.IsIntersecting(wide, 0.0f));
  EXPECT_FALSE(unit.UltraFastIsIntersecting(static_cast<Order>(6), unit) ||
               unit.UltraFastIsIntersecting(static_cast<Order>(7), unit));
  // The math box side is rounded to nearest, neither stepped nor truncated: 1 + 2^-25 rounds to 1 and
  // touches, 1 + 2^-23 is the next float and stays apart unless the tolerance closes the gap, and a
  // tiny negative max rounds to -0 and touches.
  const struct
  {
    double lo, hi, tol;
    bool meets;
  } cases[] = {{1.0 + 0x1p-25, 2.0, 0.0, true},
               {1.0 + 0x1p-23, 2.0, 0.0, false},
               {1.0 + 0x1p-23, 2.0, 0x1p-23, true},
               {-1.0, -1e-50, 0.0, true},
               {-1.0, -1e-10, 0.0, false}};
  for (const auto &c : cases)
    EXPECT_EQ(unit.IsIntersecting(RKMMathBox(c.lo, c.hi, 0, 1, 0, 1), c.tol) != 0, c.meets) << c.lo << " " << c.hi;
  EXPECT_FALSE(unit.IsIntersecting(RKMMathBox(), kInf));
}

// Axes sorted by extent, ties kept in order: extents 1..3 per axis cover every permutation and every
// kind of tie, with different origins per axis, so the extents and not the coordinates decide.
TEST(RKMPolyBoxfOverlap, AxisTestOrderSortsByExtentWithStableTies)
{
  const int kPerm[6][3] = {{0, 1, 2}, {0, 2, 1}, {1, 0, 2}, {1, 2, 0}, {2, 0, 1}, {2, 1, 0}};
  for (int code = 0; code < 27; ++code)
  {
    const float e[3] = {float(1 + code % 3), float(1 + code / 3 % 3), float(1 + code / 9)};
    int axes[3] = {0, 1, 2}, expected = 0;
    std::stable_sort(axes, axes + 3, [&](int i, int j) { return e[i] < e[j]; });
    while (!std::equal(axes, axes + 3, kPerm[expected]))
      ++expected;
    const RKMPolyBoxf b(-5.0f, e[0] - 5.0f, 7.0f, e[1] + 7.0f, -0.5f, e[2] - 0.5f);
    EXPECT_EQ(b.GetAxisTestOrder(), expected) << e[0] << " " << e[1] << " " << e[2];
  }
}

// A coarse grid nudged by less than a float step, so boxes that touch or nearly touch in double hinge
// on the rounding: every overlap test agrees with the float intervals, and none misses a double
// overlap, with or without tolerance.
TEST(RKMPolyBoxfOverlap, RandomPairsMatchIntervalOracleAndNeverMissDoubleOverlap)
{
  std::mt19937_64 rng(777u);
  const double kNudge[] = {0.0, 1e-9, -1e-9, 3e-8, -3e-8, 1e-30, -1e-30};
  std::uniform_int_distribution<int> grid(-4, 4), nudge(0, 6);
  auto coord = [&] { return 0.5 * grid(rng) + kNudge[nudge(rng)]; };
  const float kTol[] = {0.0f, 1e-9f, 0.25f, 1.0f};
  for (int iter = 0; iter < 20000; ++iter)
  {
    SCOPED_TRACE("seed 777, iteration " + std::to_string(iter));
    double l[2][3], h[2][3];
    RKMPolyBoxf f[2];
    RKMMathBox m[2];
    for (int k = 0; k < 2; ++k)
    {
      m[k] = RKMMathBox(coord(), coord(), coord(), coord(), coord(), coord());
      if (m[k].IsEmpty())
        m[k] = RKMMathBox(m[k].GetLow(), m[k].GetHigh());
      m[k].GetExtremities(l[k][0], h[k][0], l[k][1], h[k][1], l[k][2], h[k][2]);
      f[k] = RKMPolyBoxf(m[k]);
    }
    const bool withEmpty = iter % 10 == 0;
    if (withEmpty)
      f[1] = RKMPolyBoxf(1.0f, 0.5f, 0.0f, 1.0f, 0.0f, 1.0f);
    const float tol = kTol[iter % 4];
    float fl[2][3], fh[2][3];
    Bounds(f[0], fl[0], fh[0]);
    Bounds(f[1], fl[1], fh[1]);
    bool floatApart = false, doubleApart = false, doubleApartTol = false;
    for (int i = 0; i < 3; ++i)
    {
      floatApart |= double(fh[1][i]) < double(fl[0][i]) || double(fh[0][i]) < double(fl[1][i]);
      doubleApart |= h[1][i] < l[0][i] || h[0][i] < l[1][i];
      doubleApartTol |= !SumAtLeast(h[1][i], tol, l[0][i]) || !SumAtLeast(h[0][i], tol, l[1][i]);
    }
    EXPECT_EQ(bool(f[0].FastIsIntersecting(f[1])), !floatApart);
    EXPECT_EQ(bool(f[0].IsIntersecting(f[1], 0.0f)), !floatApart && !withEmpty);
    for (int o = 0; o < 6; ++o)
      EXPECT_EQ(bool(f[0].UltraFastIsIntersecting(static_cast<Order>(o), f[1])), !floatApart) << o;
    if (withEmpty)
      continue;
    EXPECT_TRUE(doubleApart || (f[0].IsIntersecting(f[1], 0.0f) && f[0].IsIntersecting(m[1], 0.0) &&
                                f[1].UltraFastIsIntersecting(f[1].GetAxisTestOrder(), f[0])));
    EXPECT_TRUE(doubleApartTol || (f[0].IsIntersecting(f[1], tol) && f[0].FastIsIntersecting(f[1], tol) &&
                                   f[0].IsIntersecting(m[1], tol)))
        << tol;
  }
}
