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
const RKMMathBox kAll(-kInf, kInf, -kInf, kInf, -kInf, kInf);

// Independent model of a box: closed per-axis intervals, empty when any one is inverted. Integer limits
// make touching faces and degenerate boxes common, where closedness bugs show.
struct Intervals
{
  double lo[3], hi[3];
  bool Empty() const { return lo[0] > hi[0] || lo[1] > hi[1] || lo[2] > hi[2]; }
  RKMMathBox Box() const { return RKMMathBox(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]); }
  explicit Intervals(std::mt19937 &rng)
  {
    std::uniform_int_distribution<int> u(-3, 3), w(-1, 11);
    for (int i = 0; i < 3; ++i)
    {
      const int k = w(rng);
      lo[i] = u(rng);
      hi[i] = lo[i] + (k < 0 ? -1 : k / 3);
    }
  }
};
} // namespace

TEST(RKMMathBox, RandomBoxesAgreeWithIntervalOracle)
{
  std::mt19937 rng(777);
  std::uniform_int_distribution<int> half(-10, 10);
  int hits = 0, empties = 0;
  for (int n = 0; n < 3000; ++n)
  {
    SCOPED_TRACE("seed 777, n=" + std::to_string(n));
    const Intervals a(rng), b(rng);
    const RKMMathBox ba = a.Box(), bb = b.Box();
    const RKMMathPoint p(half(rng) / 2.0, half(rng) / 2.0, half(rng) / 2.0);
    const double tol = (n % 4) * 0.5;
    bool meets = !a.Empty() && !b.Empty(), inside = !a.Empty();
    double gap2 = 0.0, d2 = 0.0, hull[6];
    for (int i = 0; i < 3; ++i)
    {
      const double gap = std::max(a.lo[i], b.lo[i]) - std::min(a.hi[i], b.hi[i]);
      const double d = p[i] - std::clamp(p[i], a.lo[i], std::max(a.lo[i], a.hi[i]));
      meets = meets && gap <= tol;
      gap2 += gap > 0 ? gap * gap : 0.0;
      d2 += d * d;
      inside = inside && p[i] >= a.lo[i] - tol && p[i] <= a.hi[i] + tol;
      hull[2 * i] = std::min(a.lo[i], b.lo[i]), hull[2 * i + 1] = std::max(a.hi[i], b.hi[i]);
    }
    ASSERT_EQ(ba.IsEmpty() != 0, a.Empty());
    ASSERT_EQ(ba.IsIntersecting(bb, tol) != 0, meets) << "tol=" << tol;
    ASSERT_EQ(bb.IsIntersecting(ba, tol) != 0, meets) << "tol=" << tol;
    ASSERT_EQ(ba.SquareDistanceTo(bb), a.Empty() || b.Empty() ? RKMdoubleMax : gap2);
    ASSERT_EQ(ba.SquareDistanceTo(p), a.Empty() ? RKMdoubleMax : d2);
    ASSERT_EQ(ba.DistanceTo(p), a.Empty() ? RKMdoubleMax : std::sqrt(d2));
    ASSERT_EQ(ba.IsContaining(p, tol) != 0, inside) << "tol=" << tol;
    RKMMathBox u = ba;
    u.AddInside(bb);
    // (Growing an empty box: see GrowingAnEmptiedBoxGivesOnlyWhatIsAdded.)
    ASSERT_TRUE(a.Empty() || u == (b.Empty() ? ba : RKMMathBox(hull[0], hull[1], hull[2], hull[3], hull[4], hull[5])));
    hits += meets;
    empties += a.Empty();
  }
  // Guard the generator: both answers and empty boxes must really occur.
  EXPECT_GT(hits, 200);
  EXPECT_GT(empties, 300);
}

TEST(RKMMathBox, EmptyBoxFailsCleanly)
{
  const RKMMathBox unit(0, 1, 0, 1, 0, 1);
  for (const RKMMathBox &e : {RKMMathBox(), RKMMathBox(1, 0, 0, 1, 0, 1), RKMMathBox(0, 1, 0, 1, 0, -1e-300)})
  {
    double v[6] = {42, 42, 42, 42, 42, 42};
    EXPECT_EQ(e.GetLimits(v[0], v[1], v[2], v[3], v[4], v[5]), E_FAIL);
    EXPECT_TRUE(std::all_of(v, v + 6, [](double x) { return x == 42; })) << "outputs touched";
    EXPECT_TRUE(e.SquareDistanceTo(RKMMathPoint()) == RKMdoubleMax && e.DistanceTo(RKMMathPoint()) == RKMdoubleMax &&
                unit.SquareDistanceTo(e) == RKMdoubleMax && e.Volume() == 0.0);
    EXPECT_FALSE(e.IsIntersecting(kAll, 1e300) || kAll.IsIntersecting(e, 1e300) ||
                 e.IsContaining(RKMMathPoint(), 1e300));
    EXPECT_TRUE(e == RKMMathBox() && e != RKMMathBox(0, 0, 0, 0, 0, 0));
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
  RKMMathBox b(0, 1, 0, 1, 0, 1), e, f(b), line;
  b.AddInside(RKMMathPoint(kNaN, 0.5, 5));
  double v[6];
  ASSERT_EQ(b.GetLimits(v[0], v[1], v[2], v[3], v[4], v[5]), S_OK);
  EXPECT_EQ(RKMMathBox(v[0], v[1], v[2], v[3], v[4], v[5]), RKMMathBox(-kInf, kInf, 0, 1, 0, 5));
  EXPECT_TRUE(b.IsContaining(RKMMathPoint(-1e300, 0.5, 3)) && b.IsIntersecting(RKMMathBox(1e300, 1e301, 0, 0, 5, 6)));
  e.AddInside(RKMMathPoint(kNaN, kNaN, kNaN));
  f.Inflate(kNaN);
  EXPECT_TRUE(e == kAll && f == kAll);
  EXPECT_EQ(RKMMathBox(kNaN, 1, 0, kNaN, 0, 1), RKMMathBox(-kInf, 1, 0, kInf, 0, 1));
  EXPECT_TRUE(RKMMathBox(0, 1, 0, 1, 0, 1).IsIntersecting(RKMMathBox(0.5, 2, 0.5, 2, 0.5, 2), kNaN))
      << "a NaN tolerance must not hide an overlap";
  line.AddInside(RKMMathPoint(kNaN, 1, 2));
  EXPECT_EQ(line.Volume(), 0.0) << "the unbounded x extent times the zero y extent would give inf * 0";
}

TEST(RKMMathBox, GrowingAnEmptiedBoxGivesOnlyWhatIsAdded)
{
  // A box emptied by inverted limits still stores them; growing it must not keep them on any axis.
  RKMMathBox b(0, 2, 0, 2, 0, 2), c(0, 1, 5, 4, 0, 1);
  RKMMathBox2D d(0, 1, 5, 4);
  b.Inflate(-1.5);
  b.AddInside(RKMMathPoint(10, 10, 10));
  EXPECT_EQ(b, RKMMathBox(10, 10, 10, 10, 10, 10));
  c.AddInside(RKMMathBox(10, 11, 10, 11, 10, 11));
  EXPECT_EQ(c, RKMMathBox(10, 11, 10, 11, 10, 11));
  d.AddInside(RKMMathPoint2D(10, 10));
  EXPECT_FALSE(d.IsContaining(RKMMathPoint2D(0, 5)));
}

TEST(RKMMathBox2D, EmptyNaNAndRandomIntersections)
{
  RKMMathBox2D e;
  double v[4] = {7, 7, 7, 7};
  EXPECT_EQ(e.GetLimits(v[0], v[1], v[2], v[3]), E_FAIL);
  EXPECT_TRUE(std::all_of(v, v + 4, [](double x) { return x == 7; })) << "outputs touched";
  EXPECT_FALSE(e.IsContaining(RKMMathPoint2D(), 1e300) ||
               e.IsIntersecting(RKMMathBox2D(-kInf, kInf, -kInf, kInf), 1e300));
  e.AddInside(RKMMathBox2D(3, 2, 0, 1));
  EXPECT_TRUE(e.IsEmpty()) << "adding an empty box changes nothing";
  e.AddInside(RKMMathPoint2D(kNaN, 2));
  ASSERT_EQ(e.GetLimits(v[0], v[1], v[2], v[3]), S_OK);
  EXPECT_EQ(std::vector<double>(v, v + 4), (std::vector<double>{-kInf, kInf, 2, 2}));
  std::mt19937 rng(4242);
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
    ASSERT_EQ(ba.IsIntersecting(bb, tol) != 0, meets) << "seed 4242, n=" << n;
    ASSERT_EQ(bb.IsIntersecting(ba, tol) != 0, meets) << "seed 4242, n=" << n;
    ASSERT_EQ(ba.IsContaining(RKMMathPoint2D(b[0], b[2]), tol) != 0, in) << "seed 4242, n=" << n;
  }
}
