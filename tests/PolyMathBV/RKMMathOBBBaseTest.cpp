#include "RKMPolyBVTestUtil.h"

#include "RKMMathConstants.h"
#include "RKMMathLine.h"
#include "RKMMathPlane.h"

#include <gtest/gtest.h>

#include <algorithm>

namespace
{
using namespace bvtest;
using OBB = RKMMathOBBBase;

// Every sampled pair of points bounds the distances from the side the library must not cross; returns
// whether a sampled point of a lies in b.
bool ExpectSampledBounds(Rng &g, const OBB &a, const OBB &b, int samples, int n)
{
  const double lower = a.SquareDistanceTo(b), upper = a.MaxSquareDistanceTo(b);
  bool shared = false;
  int outside = 0;
  for (int s = 0; s < samples; ++s)
  {
    const RKMMathPoint pa = SampleBox(g, a), pb = SampleBox(g, b);
    shared = shared || Inside(b, pa);
    outside += lower > pa.SquareDistanceTo(pb) || upper < pa.SquareDistanceTo(pb);
  }
  EXPECT_EQ(outside, 0) << "pair " << n << ": sampled distances outside [" << lower << ", " << upper << "]";
  return shared;
}

TEST(RKMMathOBBBase, UndefinedBoxesHoldNothing)
{
  const OBB undefined, fromEmpty{RKMMathBox()}, unit{RKMMathBox(-1, 1, -1, 1, -1, 1)};
  OBB shrunk = unit;
  shrunk.Inflate(-1.5);
  ASSERT_TRUE(unit.IsDefined());
  const RKMMathPoint o(0, 0, 0);
  for (const OBB &u : {undefined, fromEmpty, shrunk})
  {
    EXPECT_FALSE(u.IsDefined() || u.IsContaining(o, 1e10) || u.IsIntersecting(unit) || unit.IsIntersecting(u));
    EXPECT_TRUE(u.SquareDistanceTo(o) == RKMdoubleMax && u.SquareDistanceTo(unit) == RKMdoubleMax &&
                unit.SquareDistanceTo(u) == RKMdoubleMax);
    EXPECT_TRUE(u.MaxSquareDistanceTo(o) == -1.0 && u.MaxSquareDistanceTo(unit) == -1.0 &&
                unit.MaxSquareDistanceTo(u) == -1.0);
    RKMMathBox box(0, 1, 0, 1, 0, 1), box2(box);
    u.GetBox(box);
    RKMMathTransformation T(RKMMathVector(1, 2, 3));
    EXPECT_EQ(u.ConvertToBoxAndTransformation(box2, T), E_FAIL);
    EXPECT_TRUE(box.IsEmpty() && box2.IsEmpty() && T.IsIdentity());
    EXPECT_FALSE((RKMMathTransformation(RKMMathVector(1, 0, 0)) * u).IsDefined());
    OBB copy = unit;
    EXPECT_EQ(copy.Absorb(u), S_FALSE);
    EXPECT_EQ(copy.Diagonal(), unit.Diagonal());
  }
}

TEST(RKMMathOBBBase, ContainmentMatchesLocalCoordinates)
{
  Rng g(12);
  SCOPED_TRACE("seed 12");
  for (int n = 0; n < 300; ++n)
  {
    // Built from a world box far from the origin, it keeps the box's corners.
    const RKMMathPoint lo = RandomPoint(g, 1e3),
                       hi = lo + RKMMathVector(Uniform(g, 0, 5), Uniform(g, 0, 5), Uniform(g, 0, 5));
    const OBB fromBox{RKMMathBox(lo, hi)}, b = RandomOBBBase(g);
    for (int k = 0; k < 8; ++k)
      EXPECT_TRUE(Inside(fromBox, RKMMathPoint(k & 1 ? hi.x : lo.x, k & 2 ? hi.y : lo.y, k & 4 ? hi.z : lo.z))) << n;
    EXPECT_TRUE(b.IsContaining(SampleBox(g, b))) << n;
    // Just beyond a face, by far more than rounding: out, unless the tolerance reaches it.
    const int axis = n % 3;
    const RKMMathPoint beyond = b.Center() + b.Axis(axis) * (b.Diagonal()[axis] * (1 + 1e-6));
    EXPECT_FALSE(b.IsContaining(beyond)) << n;
    EXPECT_TRUE(b.IsContaining(beyond, b.Diagonal()[axis] * 2e-6)) << n;
  }
}

// The offset from the centre of the corner farthest along n.
RKMMathVector SupportOffset(const RKMMathVector axes[3], const RKMMathVector &h, const RKMMathVector &n)
{
  RKMMathVector o;
  for (int i = 0; i < 3; ++i)
    o += axes[i] * (n * axes[i] >= 0 ? h[i] : -h[i]);
  return o;
}

// Boxes built to share a point are never disjoint. Half the pairs only touch (extreme corners along
// some n placed on the same point: a gap of exactly zero on some axis); parallel and nearly parallel
// axes, where the cross-product axes degenerate, are mixed in.
TEST(RKMMathOBBBase, BoxesSharingAPointIntersect)
{
  Rng g(13);
  SCOPED_TRACE("seed 13");
  for (int n = 0; n < 4000; ++n)
  {
    const OBB a = RandomOBBBase(g);
    RKMMathVector axes[3];
    const bool aligned = n % 2 == 1, touching = n % 4 >= 2;
    const RKMMath3x3Matrix R = aligned ? RKMMath3x3Matrix() : RandomRotation(g);
    // The same axes as a, or turned by a tiny angle about a random axis.
    const double angle = !aligned || n % 8 < 4 ? 0.0 : std::pow(10.0, Uniform(g, -14, -5));
    const RKMMathVector k = aligned ? RandomUnit(g) : RKMMathVector();
    for (int i = 0; i < 3; ++i)
      axes[i] = !aligned ? R.GetColumn(i)
                         : a.Axis(i) * std::cos(angle) + (k ^ a.Axis(i)) * std::sin(angle) +
                               k * ((k * a.Axis(i)) * (1 - std::cos(angle)));
    const RKMMathVector h(Uniform(g, 0.05, 2), Uniform(g, 0.05, 2), Uniform(g, 0.05, 2)),
        aAxes[3] = {a.U(), a.V(), a.W()};
    const RKMMathVector dir = !touching ? RKMMathVector()
                              : aligned ? a.Axis(n % 3) * (n % 5 < 2 ? -1.0 : 1.0)
                                        : RandomUnit(g);
    const RKMMathPoint p = touching ? a.Center() + SupportOffset(aAxes, a.Diagonal(), dir)
                                    : FromLocal(a, a.Diagonal().x * BoundaryBiased(g),
                                                a.Diagonal().y * BoundaryBiased(g), a.Diagonal().z * BoundaryBiased(g));
    const RKMMathVector q = touching ? SupportOffset(axes, h, -dir)
                                     : axes[0] * (h.x * BoundaryBiased(g)) + axes[1] * (h.y * BoundaryBiased(g)) +
                                           axes[2] * (h.z * BoundaryBiased(g));
    const OBB b(axes, h, p - q);
    EXPECT_TRUE(a.IsIntersecting(b) && b.IsIntersecting(a)) << "pair " << n;
    EXPECT_EQ(a.SquareDistanceTo(b), 0.0) << "pair " << n;
  }
}

// Close pairs, overlapping or a little apart: a sampled point of a inside b proves overlap.
TEST(RKMMathOBBBase, ClosePairsAgainstSampling)
{
  Rng g(14);
  SCOPED_TRACE("seed 14");
  int overlapping = 0, apart = 0;
  for (int n = 0; n < 1500; ++n)
  {
    const OBB a = RandomOBBBase(g, 2.0), b = RandomOBBBase(g, 2.0);
    apart += a.SquareDistanceTo(b) > 0.0;
    if (!ExpectSampledBounds(g, a, b, 200, n))
      continue;
    ++overlapping;
    EXPECT_TRUE(a.IsIntersecting(b) && b.IsIntersecting(a)) << "pair " << n;
  }
  EXPECT_GT(overlapping, 300);
  EXPECT_GT(apart, 300);
}

// Pulled apart beyond their bounding spheres: some of the fifteen axes separates them, and the
// distances reported bound the sampled ones (the maximum tightly, against the corners).
TEST(RKMMathOBBBase, SeparatedBoxesAreDisjointAndDistancesAreBounds)
{
  Rng g(15);
  SCOPED_TRACE("seed 15");
  for (int n = 0; n < 500; ++n)
  {
    const OBB a = RandomOBBBase(g), b0 = RandomOBBBase(g);
    const double gap = Uniform(g, 1e-3, 2);
    const OBB b = Moved(b0, a.Center() + RandomUnit(g) * (a.Diagonal().Norm() + b0.Diagonal().Norm() + gap));
    EXPECT_FALSE(a.IsIntersecting(b)) << "pair " << n;
    const double lower = a.SquareDistanceTo(b), upper = a.MaxSquareDistanceTo(b);
    EXPECT_GT(lower, 0.0) << "pair " << n;
    EXPECT_NEAR(lower, b.SquareDistanceTo(a), 1e-9 * (1 + lower));
    double trueMax = 0;
    for (const RKMMathPoint &ca : Corners(a))
      for (const RKMMathPoint &cb : Corners(b))
        trueMax = std::max(trueMax, ca.SquareDistanceTo(cb));
    EXPECT_TRUE(upper >= trueMax && upper <= trueMax * (1 + 1e-9)) << "pair " << n;
    ExpectSampledBounds(g, a, b, 100, n);
  }
  // Sharing their axes, the boxes are separated along a face axis and the bound is the exact gap.
  const OBB a = Moved(RandomOBBBase(g), RKMMathPoint(1, 1, 1));
  const RKMMathVector axes[3] = {a.U(), a.V(), a.W()};
  const OBB wide(axes, RKMMathVector(1, 2, 3), a.Center()),
      b(axes, RKMMathVector(0.5, 1, 1), a.Center() + a.U() * 3.5 + a.V() * 0.5);
  EXPECT_NEAR(wide.SquareDistanceTo(b), 4.0, 1e-9);
}

TEST(RKMMathOBBBase, PointDistancesBracketTheTrueOnes)
{
  Rng g(16);
  SCOPED_TRACE("seed 16");
  for (int n = 0; n < 2000; ++n)
  {
    const OBB b = RandomOBBBase(g);
    const RKMMathPoint p = n % 4 == 0 ? SampleBox(g, b) : RandomPoint(g, 8), l = Local(b, p);
    const RKMMathVector h = b.Diagonal();
    const double d2 = p.SquareDistanceTo(
        FromLocal(b, std::clamp(l.x, -h.x, h.x), std::clamp(l.y, -h.y, h.y), std::clamp(l.z, -h.z, h.z)));
    double m2 = 0;
    for (const RKMMathPoint &c : Corners(b))
      m2 = std::max(m2, c.SquareDistanceTo(p));
    const double lib = b.SquareDistanceTo(p), libMax = b.MaxSquareDistanceTo(p);
    EXPECT_TRUE(lib <= d2 && lib >= d2 * (1 - 1e-9) - 1e-12) << n << ": " << lib << " for " << d2;
    EXPECT_TRUE(libMax >= m2 && libMax <= m2 * (1 + 1e-9)) << n << ": " << libMax << " for " << m2;
  }
}

// The merged box keeps the target's axes and holds both; a box already held changes nothing.
TEST(RKMMathOBBBase, AbsorbContainsBothBoxes)
{
  Rng g(17);
  SCOPED_TRACE("seed 17");
  for (int n = 0; n < 500; ++n)
  {
    const OBB a = RandomOBBBase(g), b = RandomOBBBase(g);
    OBB merged = a, again, target = a, undefined;
    EXPECT_EQ(merged.Absorb(b), S_OK);
    for (int i = 0; i < 3; ++i)
      EXPECT_EQ(merged.Axis(i), a.Axis(i));
    for (const OBB *box : {&a, &b})
      for (const RKMMathPoint &c : Corners(*box))
        EXPECT_TRUE(Inside(merged, c)) << "pair " << n;
    again = merged;
    EXPECT_EQ(again.Absorb(b), S_FALSE);
    EXPECT_EQ(again.Diagonal(), merged.Diagonal());
    // Inside a, with other axes.
    const double m = std::min({a.Diagonal().x, a.Diagonal().y, a.Diagonal().z}) / 2;
    const RKMMath3x3Matrix R = RandomRotation(g);
    const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
    EXPECT_EQ(target.Absorb(OBB(axes, RKMMathVector(m, m, m) * 0.5, a.Center())), S_FALSE);
    EXPECT_TRUE(target.Diagonal() == a.Diagonal() && target.Center() == a.Center());
    EXPECT_EQ(undefined.Absorb(b), S_OK);
    EXPECT_TRUE(undefined.Center() == b.Center() && undefined.Diagonal() == b.Diagonal());
  }
}

TEST(RKMMathOBBBase, GetBoxEnclosesTightly)
{
  Rng g(18);
  SCOPED_TRACE("seed 18");
  for (int n = 0; n < 500; ++n)
  {
    const OBB b = RandomOBBBase(g, n % 2 ? 5.0 : 1e6);
    RKMMathBox box;
    b.GetBox(box);
    double lo[3] = {RKMdoubleMax, RKMdoubleMax, RKMdoubleMax}, hi[3] = {-RKMdoubleMax, -RKMdoubleMax, -RKMdoubleMax};
    for (const RKMMathPoint &c : Corners(b))
    {
      EXPECT_TRUE(box.IsContaining(c)) << n;
      for (int i = 0; i < 3; ++i)
        lo[i] = std::min(lo[i], c[i]), hi[i] = std::max(hi[i], c[i]);
    }
    for (int i = 0; i < 3; ++i)
      EXPECT_TRUE(box.GetLow()[i] >= lo[i] - 1e-9 * (1 + std::fabs(lo[i])) &&
                  box.GetHigh()[i] <= hi[i] + 1e-9 * (1 + std::fabs(hi[i])))
          << n;
  }
}

TEST(RKMMathOBBBase, FramesConvertAndRoundTrip)
{
  Rng g(19);
  SCOPED_TRACE("seed 19");
  for (int n = 0; n < 300; ++n)
  {
    const OBB b = RandomOBBBase(g);
    RKMMathBox box;
    RKMMathTransformation T;
    ASSERT_EQ(b.ConvertToBoxAndTransformation(box, T), S_OK);
    const RKMMathVector h = b.Diagonal();
    EXPECT_EQ(box, RKMMathBox(-h.x, h.x, -h.y, h.y, -h.z, h.z));
    double s = 0;
    EXPECT_TRUE(T.IsSimilitude(s));
    EXPECT_NEAR(s, 1.0, 1e-12);
    for (int k = 0; k < 8; ++k)
    {
      const RKMMathPoint c((k & 1 ? 1 : -1) * h.x, (k & 2 ? 1 : -1) * h.y, (k & 4 ? 1 : -1) * h.z);
      EXPECT_LT((T * c).DistanceTo(FromLocal(b, c.x, c.y, c.z)), 1e-12);
    }
    const RKMMathPoint p = RandomPoint(g, 10);
    EXPECT_LT(b.UVWtoXYZ(b.XYZtoUVW(p)).DistanceTo(p), 1e-12);
    EXPECT_LT(b.XYZtoUVW(b.UVWtoXYZ(p)).DistanceTo(p), 1e-12);
    EXPECT_LT(b.UVWtoXYZ(p).DistanceTo(FromLocal(b, p.x, p.y, p.z)), 1e-12);
  }
}

// Under every kind of map, and a flattening one, the image box holds the image of the box.
TEST(RKMMathOBBBase, TransformedBoxEnclosesTheImage)
{
  Rng g(20);
  SCOPED_TRACE("seed 20");
  const RKMMathTransformation flatten(RKMMath3x3Matrix(1, 0, 0, 0, 1, 0, 0, 0, 0), RKMMathVector(1, 2, 3));
  for (int kind = 0; kind < 5; ++kind)
    for (int n = 0; n < (kind < 4 ? 300 : 100); ++n)
    {
      const OBB b = RandomOBBBase(g);
      const RKMMathTransformation T = kind < 4 ? RandomTransformation(g, kAllTKinds[kind]) : flatten;
      const OBB image = T * b;
      ASSERT_TRUE(image.IsDefined());
      for (int s = 0; s < (kind < 4 ? 30 : 20); ++s)
        ASSERT_TRUE(Inside(image, T * SampleBox(g, b)))
            << (kind < 4 ? Name(kAllTKinds[kind]) : "flat") << ", box " << n;
      for (int i = 0; kind == 0 && i < 3; ++i)
        EXPECT_NEAR(image.Diagonal()[i], b.Diagonal()[i], 1e-9) << "a rigid motion keeps the size";
    }
}

TEST(RKMMathPlaneLine, NormalDistanceAndProjection)
{
  // Origin, directions, expected normal and a point at the given distance. Parallel directions span
  // no plane: no normal, and the distance falls back to the origin.
  const double h = std::sqrt(0.5);
  const struct
  {
    RKMMathPlane plane;
    RKMMathVector normal;
    RKMMathPoint p;
    double distance;
  } planes[] = {{RKMMathPlane(), {0, 0, 1}, {3, -4, -2.5}, 2.5},
                {RKMMathPlane({1, 1, 1}, {0, 3, 0}, {0, 0, 0.5}), {1, 0, 0}, {-2, 7, 9}, 3.0},
                {RKMMathPlane({0, 0, 0}, {1, 1, 0}, {0, 0, 1}), {h, -h, 0}, {1, 0, 5}, h},
                {RKMMathPlane({1, 0, 0}, {1, 2, 3}, {2, 4, 6}), {0, 0, 0}, {4, 4, 0}, 5.0}};
  for (const auto &c : planes)
  {
    EXPECT_LT((c.plane.GetNormal() - c.normal).Norm(), 1e-15) << c.distance;
    EXPECT_NEAR(c.plane.DistanceTo(c.p), c.distance, 1e-15);
  }
  const RKMMathLine line(RKMMathPoint(1, 2, 3), RKMMathVector(0, 0, 7)), null(RKMMathPoint(1, 1, 1), RKMMathVector());
  EXPECT_EQ(line.Project(RKMMathPoint(4, 6, -1)), RKMMathPoint(1, 2, -1));
  EXPECT_TRUE(line.SquareDistanceTo(RKMMathPoint(4, 6, -1)) == 25.0 && line.DistanceTo(RKMMathPoint(4, 6, -1)) == 5.0);
  EXPECT_EQ(null.Project(RKMMathPoint(5, 5, 5)), RKMMathPoint(1, 1, 1));
  EXPECT_DOUBLE_EQ(null.SquareDistanceTo(RKMMathPoint(1, 1, 3)), 4.0);
  Rng g(21);
  for (int n = 0; n < 100; ++n)
  {
    const RKMMathLine l(RandomPoint(g, 5), RandomUnit(g) * Uniform(g, 0.1, 10));
    const RKMMathPoint q = RandomPoint(g, 5), f = l.Project(q);
    EXPECT_NEAR((q - f) * l.GetDirection(), 0.0, 1e-10) << "seed 21, line " << n;
    EXPECT_NEAR(l.SquareDistanceTo(q), q.SquareDistanceTo(f), 1e-12);
    EXPECT_LE(l.DistanceTo(q), q.DistanceTo(l.GetOrigin()) + 1e-12);
  }
}
} // namespace
