#include "RKMMathBox.h"
#include "RKMMathBox2D.h"
#include "RKMMathConstants.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <limits>
#include <random>
#include <string>
#include <vector>

namespace
{
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();

// Independent model of a box: closed per-axis intervals, empty when any one is inverted.
struct Intervals
{
  double lo[3], hi[3];
  bool Empty() const { return lo[0] > hi[0] || lo[1] > hi[1] || lo[2] > hi[2]; }
  RKMMathBox Box() const { return RKMMathBox(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]); }
};

// Integer limits make touching faces and degenerate boxes common, where closedness bugs show.
Intervals RandomIntervals(std::mt19937 &rng)
{
  std::uniform_int_distribution<int> u(-3, 3), w(-1, 11);
  Intervals r{};
  for (int i = 0; i < 3; ++i)
  {
    const int k = w(rng);
    r.lo[i] = u(rng);
    r.hi[i] = r.lo[i] + (k < 0 ? -1 : k / 3);
  }
  return r;
}
} // namespace

TEST(RKMMathBox, RandomBoxesAgreeWithIntervalOracle)
{
  const unsigned seed = 777;
  SCOPED_TRACE("seed " + std::to_string(seed));
  std::mt19937 rng(seed);
  std::uniform_int_distribution<int> half(-10, 10);
  int hits = 0, empties = 0;
  for (int n = 0; n < 3000; ++n)
  {
    const Intervals a = RandomIntervals(rng), b = RandomIntervals(rng);
    const RKMMathBox ba = a.Box(), bb = b.Box();
    const RKMMathPoint p(half(rng) / 2.0, half(rng) / 2.0, half(rng) / 2.0);
    const double tol = (n % 4) * 0.5;
    const bool none = a.Empty() || b.Empty();
    bool meets = !none, inside = !a.Empty();
    double gap2 = 0.0, d2 = 0.0;
    for (int i = 0; i < 3; ++i)
    {
      const double gap = std::max(a.lo[i], b.lo[i]) - std::min(a.hi[i], b.hi[i]);
      const double d = p[i] - std::clamp(p[i], a.lo[i], std::max(a.lo[i], a.hi[i]));
      meets = meets && gap <= tol;
      gap2 += gap > 0 ? gap * gap : 0.0;
      d2 += d * d;
      inside = inside && p[i] >= a.lo[i] - tol && p[i] <= a.hi[i] + tol;
    }
    ASSERT_EQ(ba.IsEmpty() != 0, a.Empty()) << "n=" << n;
    ASSERT_EQ(ba.IsIntersecting(bb, tol) != 0, meets) << "n=" << n << " tol=" << tol;
    ASSERT_EQ(bb.IsIntersecting(ba, tol) != 0, meets) << "n=" << n << " tol=" << tol;
    ASSERT_EQ(ba.SquareDistanceTo(bb), none ? RKMdoubleMax : gap2) << "n=" << n;
    ASSERT_EQ(ba.SquareDistanceTo(p), a.Empty() ? RKMdoubleMax : d2) << "n=" << n;
    ASSERT_EQ(ba.DistanceTo(p), a.Empty() ? RKMdoubleMax : std::sqrt(d2)) << "n=" << n;
    ASSERT_EQ(ba.IsContaining(p, tol) != 0, inside) << "n=" << n << " tol=" << tol;
    RKMMathBox u = ba;
    u.AddInside(bb);
    const RKMMathBox hull(std::min(a.lo[0], b.lo[0]), std::max(a.hi[0], b.hi[0]), std::min(a.lo[1], b.lo[1]),
                          std::max(a.hi[1], b.hi[1]), std::min(a.lo[2], b.lo[2]), std::max(a.hi[2], b.hi[2]));
    if (!a.Empty()) // growing an empty box is covered below
    {
      ASSERT_EQ(u, b.Empty() ? ba : hull) << "n=" << n;
    }
    hits += meets;
    empties += a.Empty();
  }
  // Guard the generator: both answers and empty boxes must really occur.
  EXPECT_GT(hits, 200);
  EXPECT_GT(empties, 300);
}

TEST(RKMMathBox, EmptyBoxFailsCleanly)
{
  const RKMMathBox unit(0, 1, 0, 1, 0, 1), all(-kInf, kInf, -kInf, kInf, -kInf, kInf);
  for (const RKMMathBox &e : {RKMMathBox(), RKMMathBox(1, 0, 0, 1, 0, 1), RKMMathBox(0, 1, 0, 1, 0, -1e-300)})
  {
    double v[6] = {42, 42, 42, 42, 42, 42};
    EXPECT_EQ(e.GetLimits(v[0], v[1], v[2], v[3], v[4], v[5]), E_FAIL);
    EXPECT_TRUE(std::all_of(v, v + 6, [](double x) { return x == 42; })) << "outputs touched";
    EXPECT_EQ(e.SquareDistanceTo(RKMMathPoint()), RKMdoubleMax);
    EXPECT_EQ(e.DistanceTo(RKMMathPoint()), RKMdoubleMax);
    EXPECT_EQ(unit.SquareDistanceTo(e), RKMdoubleMax);
    EXPECT_EQ(e.Volume(), 0.0);
    EXPECT_FALSE(e.IsIntersecting(all, 1e300));
    EXPECT_FALSE(all.IsIntersecting(e, 1e300));
    EXPECT_FALSE(e.IsContaining(RKMMathPoint(), 1e300));
    EXPECT_EQ(e, RKMMathBox());
    EXPECT_NE(e, RKMMathBox(0, 0, 0, 0, 0, 0));
    RKMMathBox f = e;
    f.Inflate(RKMdoubleMax); // would turn the default empty box into [0, 0]^3 if applied
    EXPECT_TRUE(f.IsEmpty());
  }
  RKMMathBox b(RKMMathPoint(2, -1, 4), RKMMathPoint(0, 3, 1));
  EXPECT_EQ(b, RKMMathBox(0, 2, -1, 3, 1, 4)) << "corners in any order";
  EXPECT_EQ(b.Volume(), 24.0);
  b.Inflate(-0.99);
  EXPECT_FALSE(b.IsEmpty());
  b.Inflate(-0.02);
  EXPECT_TRUE(b.IsEmpty()) << "shrinking by more than half the x extent empties the box";
}

TEST(RKMMathBox, NaNLeavesAxisUnboundedSoNothingIsLost)
{
  RKMMathBox b(0, 1, 0, 1, 0, 1);
  b.AddInside(RKMMathPoint(kNaN, 0.5, 5));
  double v[6];
  ASSERT_EQ(b.GetLimits(v[0], v[1], v[2], v[3], v[4], v[5]), S_OK);
  EXPECT_EQ(RKMMathBox(v[0], v[1], v[2], v[3], v[4], v[5]), RKMMathBox(-kInf, kInf, 0, 1, 0, 5));
  EXPECT_TRUE(b.IsContaining(RKMMathPoint(-1e300, 0.5, 3)));
  EXPECT_TRUE(b.IsIntersecting(RKMMathBox(1e300, 1e301, 0, 0, 5, 6)));
  const RKMMathBox all(-kInf, kInf, -kInf, kInf, -kInf, kInf);
  RKMMathBox e;
  e.AddInside(RKMMathPoint(kNaN, kNaN, kNaN));
  EXPECT_EQ(e, all);
  EXPECT_EQ(RKMMathBox(kNaN, 1, 0, kNaN, 0, 1), RKMMathBox(-kInf, 1, 0, kInf, 0, 1));
  RKMMathBox f(0, 1, 0, 1, 0, 1);
  f.Inflate(kNaN);
  EXPECT_EQ(f, all);
  EXPECT_TRUE(RKMMathBox(0, 1, 0, 1, 0, 1).IsIntersecting(RKMMathBox(0.5, 2, 0.5, 2, 0.5, 2), kNaN))
      << "a NaN tolerance must not hide an overlap";
}

TEST(RKMMathBox, VolumeOfLineWithUnboundedAxisIsZero)
{
  // The unbounded x extent times the zero y extent would give inf * 0.
  RKMMathBox b;
  b.AddInside(RKMMathPoint(kNaN, 1, 2));
  EXPECT_EQ(b.Volume(), 0.0);
}

TEST(RKMMathBox, GrowingAnEmptiedBoxGivesOnlyWhatIsAdded)
{
  // A box emptied by inverted limits still stores them; growing it must not keep them on any axis.
  RKMMathBox b(0, 2, 0, 2, 0, 2);
  b.Inflate(-1.5);
  b.AddInside(RKMMathPoint(10, 10, 10));
  EXPECT_EQ(b, RKMMathBox(10, 10, 10, 10, 10, 10));
  RKMMathBox c(0, 1, 5, 4, 0, 1);
  c.AddInside(RKMMathBox(10, 11, 10, 11, 10, 11));
  EXPECT_EQ(c, RKMMathBox(10, 11, 10, 11, 10, 11));
  RKMMathBox2D d(0, 1, 5, 4);
  d.AddInside(RKMMathPoint2D(10, 10));
  EXPECT_FALSE(d.IsContaining(RKMMathPoint2D(0, 5)));
}

TEST(RKMMathBox2D, EmptyNaNAndRandomIntersections)
{
  RKMMathBox2D e;
  double v[4] = {7, 7, 7, 7};
  EXPECT_EQ(e.GetLimits(v[0], v[1], v[2], v[3]), E_FAIL);
  EXPECT_TRUE(std::all_of(v, v + 4, [](double x) { return x == 7; })) << "outputs touched";
  EXPECT_FALSE(e.IsContaining(RKMMathPoint2D(), 1e300));
  EXPECT_FALSE(e.IsIntersecting(RKMMathBox2D(-kInf, kInf, -kInf, kInf), 1e300));
  e.AddInside(RKMMathBox2D(3, 2, 0, 1));
  EXPECT_TRUE(e.IsEmpty()) << "adding an empty box changes nothing";
  e.AddInside(RKMMathPoint2D(kNaN, 2));
  ASSERT_EQ(e.GetLimits(v[0], v[1], v[2], v[3]), S_OK);
  EXPECT_EQ(std::vector<double>(v, v + 4), (std::vector<double>{-kInf, kInf, 2, 2}));

  const unsigned seed = 4242;
  SCOPED_TRACE("seed " + std::to_string(seed));
  std::mt19937 rng(seed);
  std::uniform_int_distribution<int> u(-4, 4);
  for (int n = 0; n < 2000; ++n)
  {
    double a[4], b[4];
    for (int i = 0; i < 4; ++i)
      a[i] = u(rng), b[i] = u(rng);
    const RKMMathBox2D ba(a[0], a[1], a[2], a[3]);
    RKMMathBox2D bb;
    bb.AddInside(RKMMathPoint2D(b[0], b[2]));
    bb.AddInside(RKMMathPoint2D(b[1], b[3]));
    const double tol = (n % 3) * 0.5;
    const bool ok = a[0] <= a[1] && a[2] <= a[3];
    const bool meets = ok && std::max(a[0], std::min(b[0], b[1])) - std::min(a[1], std::max(b[0], b[1])) <= tol &&
                       std::max(a[2], std::min(b[2], b[3])) - std::min(a[3], std::max(b[2], b[3])) <= tol;
    const bool in = ok && b[0] >= a[0] - tol && b[0] <= a[1] + tol && b[2] >= a[2] - tol && b[2] <= a[3] + tol;
    ASSERT_EQ(ba.IsIntersecting(bb, tol) != 0, meets) << "n=" << n;
    ASSERT_EQ(bb.IsIntersecting(ba, tol) != 0, meets) << "n=" << n;
    ASSERT_EQ(ba.IsContaining(RKMMathPoint2D(b[0], b[2]), tol) != 0, in) << "n=" << n;
  }
}
