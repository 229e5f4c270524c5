#include "RKMPolyBVTestUtil.h"

#include "RKMMathBox.h"
#include "RKMMathConstants.h"
#include "RKMMathLine.h"
#include "RKMMathOBBBase.h"
#include "RKMMathPlane.h"
#include "RKMMathTransformation.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <initializer_list>
#include <string>
#include <vector>

namespace
{
using namespace bvtest;

RKMMathOBBBase RandomBox(Rng &g, double spread = 5.0)
{
  const RKMMath3x3Matrix R = RandomRotation(g);
  const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
  return RKMMathOBBBase(axes, RKMMathVector(Uniform(g, 0.05, 2), Uniform(g, 0.05, 2), Uniform(g, 0.05, 2)),
                        RandomPoint(g, spread));
}

// The oracle works from the box's own data, without the code under test.
RKMMathPoint FromLocal(const RKMMathOBBBase &b, double u, double v, double w)
{
  return b.Center() + b.U() * u + b.V() * v + b.W() * w;
}

RKMMathPoint Local(const RKMMathOBBBase &b, const RKMMathPoint &p)
{
  const RKMMathVector d = p - b.Center();
  return {d * b.U(), d * b.V(), d * b.W()};
}

bool Inside(const RKMMathOBBBase &b, const RKMMathPoint &p)
{
  const RKMMathPoint l = Local(b, p);
  return std::fabs(l.x) <= b.Diagonal().x && std::fabs(l.y) <= b.Diagonal().y && std::fabs(l.z) <= b.Diagonal().z;
}

std::vector<RKMMathPoint> Corners(const RKMMathOBBBase &b)
{
  std::vector<RKMMathPoint> c;
  const RKMMathVector h = b.Diagonal();
  for (int k = 0; k < 8; ++k)
    c.push_back(FromLocal(b, (k & 1 ? 1 : -1) * h.x, (k & 2 ? 1 : -1) * h.y, (k & 4 ? 1 : -1) * h.z));
  return c;
}

// Corners, edge, face and interior points, shrunk off the boundary.
RKMMathPoint SampleBox(Rng &g, const RKMMathOBBBase &b)
{
  const RKMMathVector h = b.Diagonal() * kShrink;
  return FromLocal(b, h.x * BoundaryBiased(g), h.y * BoundaryBiased(g), h.z * BoundaryBiased(g));
}

double TrueSquareDistance(const RKMMathOBBBase &b, const RKMMathPoint &p)
{
  const RKMMathPoint l = Local(b, p);
  const RKMMathVector h = b.Diagonal();
  return p.SquareDistanceTo(FromLocal(b, std::clamp(l.x, -h.x, h.x), std::clamp(l.y, -h.y, h.y), std::clamp(l.z, -h.z, h.z)));
}

double TrueMaxSquareDistance(const RKMMathOBBBase &b, const RKMMathPoint &p)
{
  double m = 0;
  for (const RKMMathPoint &c : Corners(b))
    m = std::max(m, c.SquareDistanceTo(p));
  return m;
}

TEST(RKMMathOBBBase, UndefinedBoxesHoldNothing)
{
  const RKMMathOBBBase undefined, fromEmpty{RKMMathBox()}, unit{RKMMathBox(-1, 1, -1, 1, -1, 1)};
  ASSERT_TRUE(unit.IsDefined());
  for (const RKMMathOBBBase &u : std::initializer_list<RKMMathOBBBase>{undefined, fromEmpty})
  {
    EXPECT_FALSE(u.IsDefined());
    EXPECT_FALSE(u.IsContaining(RKMMathPoint(0, 0, 0), 1e10));
    EXPECT_FALSE(u.IsIntersecting(unit));
    EXPECT_FALSE(unit.IsIntersecting(u));
    EXPECT_EQ(u.SquareDistanceTo(RKMMathPoint(0, 0, 0)), RKMdoubleMax);
    EXPECT_EQ(u.SquareDistanceTo(unit), RKMdoubleMax);
    EXPECT_EQ(unit.SquareDistanceTo(u), RKMdoubleMax);
    EXPECT_EQ(u.MaxSquareDistanceTo(RKMMathPoint(0, 0, 0)), -1.0);
    EXPECT_EQ(u.MaxSquareDistanceTo(unit), -1.0);
    EXPECT_EQ(unit.MaxSquareDistanceTo(u), -1.0);
    RKMMathBox box(0, 1, 0, 1, 0, 1);
    u.GetBox(box);
    EXPECT_TRUE(box.IsEmpty());
    RKMMathTransformation T(RKMMathVector(1, 2, 3));
    EXPECT_EQ(u.ConvertToBoxAndTransformation(box, T), E_FAIL);
    EXPECT_TRUE(box.IsEmpty());
    EXPECT_TRUE(T.IsIdentity());
    EXPECT_FALSE((RKMMathTransformation(RKMMathVector(1, 0, 0)) * u).IsDefined());
    RKMMathOBBBase copy = unit;
    EXPECT_EQ(copy.Absorb(u), S_FALSE);
    EXPECT_EQ(copy.Diagonal(), unit.Diagonal());
  }
  RKMMathOBBBase shrunk = unit;
  shrunk.Inflate(-1.5);
  EXPECT_FALSE(shrunk.IsDefined());
}

TEST(RKMMathOBBBase, ContainmentMatchesLocalCoordinates)
{
  Rng g(12);
  SCOPED_TRACE("seed 12");
  for (int n = 0; n < 300; ++n)
  {
    // Built from a world box far from the origin, it keeps the box's corners.
    const RKMMathPoint lo = RandomPoint(g, 1e3), hi = lo + RKMMathVector(Uniform(g, 0, 5), Uniform(g, 0, 5), Uniform(g, 0, 5));
    const RKMMathOBBBase fromBox{RKMMathBox(lo, hi)};
    for (int k = 0; k < 8; ++k)
      EXPECT_TRUE(Inside(fromBox, RKMMathPoint(k & 1 ? hi.x : lo.x, k & 2 ? hi.y : lo.y, k & 4 ? hi.z : lo.z))) << n;

    const RKMMathOBBBase b = RandomBox(g);
    EXPECT_TRUE(b.IsContaining(SampleBox(g, b)));
    // Just beyond a face, by far more than rounding: out, unless the tolerance reaches it.
    const int axis = n % 3;
    const RKMMathPoint beyond = b.Center() + b.Axis(axis) * (b.Diagonal()[axis] * (1 + 1e-6));
    EXPECT_FALSE(b.IsContaining(beyond));
    EXPECT_TRUE(b.IsContaining(beyond, b.Diagonal()[axis] * 2e-6));
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

// Boxes built to share a point must never be called disjoint. Half the pairs only touch: each box's
// extreme corner along a direction n is placed on the same point, so some separating axis has a gap
// of exactly zero and only the rounding allowance keeps them intersecting. Parallel and nearly
// parallel axes, where the cross-product axes degenerate, are mixed in.
TEST(RKMMathOBBBase, BoxesSharingAPointIntersect)
{
  Rng g(13);
  SCOPED_TRACE("seed 13");
  for (int n = 0; n < 4000; ++n)
  {
    const RKMMathOBBBase a = RandomBox(g);
    RKMMathVector axes[3];
    const bool aligned = n % 2 == 1, touching = n % 4 >= 2;
    if (!aligned)
    {
      const RKMMath3x3Matrix R = RandomRotation(g);
      for (int i = 0; i < 3; ++i)
        axes[i] = R.GetColumn(i);
    }
    else
    {
      // The same axes, or turned by a tiny angle about a random axis.
      const double angle = n % 8 < 4 ? 0.0 : std::pow(10.0, Uniform(g, -14, -5));
      const RKMMathVector k = RandomUnit(g);
      for (int i = 0; i < 3; ++i)
      {
        const RKMMathVector &v = a.Axis(i);
        axes[i] = v * std::cos(angle) + (k ^ v) * std::sin(angle) + k * ((k * v) * (1 - std::cos(angle)));
      }
    }
    const RKMMathVector h(Uniform(g, 0.05, 2), Uniform(g, 0.05, 2), Uniform(g, 0.05, 2));
    RKMMathPoint p;
    RKMMathVector q;
    if (touching)
    {
      const RKMMathVector aAxes[3] = {a.U(), a.V(), a.W()};
      const RKMMathVector dir = aligned ? a.Axis(n % 3) * (n % 5 < 2 ? -1.0 : 1.0) : RandomUnit(g);
      p = a.Center() + SupportOffset(aAxes, a.Diagonal(), dir);
      q = SupportOffset(axes, h, -dir);
    }
    else
    {
      p = FromLocal(a, a.Diagonal().x * BoundaryBiased(g), a.Diagonal().y * BoundaryBiased(g), a.Diagonal().z * BoundaryBiased(g));
      q = axes[0] * (h.x * BoundaryBiased(g)) + axes[1] * (h.y * BoundaryBiased(g)) + axes[2] * (h.z * BoundaryBiased(g));
    }
    const RKMMathOBBBase b(axes, h, p - q);
    EXPECT_TRUE(a.IsIntersecting(b)) << "pair " << n;
    EXPECT_TRUE(b.IsIntersecting(a)) << "pair " << n;
    EXPECT_EQ(a.SquareDistanceTo(b), 0.0) << "pair " << n;
  }
}

// Close pairs, overlapping or a little apart: a sampled point of a inside b proves overlap, and every
// sampled pair of points bounds the distances from the side the library must not cross.
TEST(RKMMathOBBBase, ClosePairsAgainstSampling)
{
  Rng g(14);
  SCOPED_TRACE("seed 14");
  int overlapping = 0, apart = 0;
  for (int n = 0; n < 1500; ++n)
  {
    const RKMMathOBBBase a = RandomBox(g, 2.0), b = RandomBox(g, 2.0);
    const double lower = a.SquareDistanceTo(b), upper = a.MaxSquareDistanceTo(b);
    bool shared = false;
    for (int s = 0; s < 200; ++s)
    {
      const RKMMathPoint pa = SampleBox(g, a), pb = SampleBox(g, b);
      shared = shared || Inside(b, pa);
      ASSERT_LE(lower, pa.SquareDistanceTo(pb)) << "pair " << n;
      ASSERT_GE(upper, pa.SquareDistanceTo(pb)) << "pair " << n;
    }
    apart += lower > 0.0;
    if (!shared)
      continue;
    ++overlapping;
    EXPECT_TRUE(a.IsIntersecting(b)) << "pair " << n;
    EXPECT_TRUE(b.IsIntersecting(a)) << "pair " << n;
  }
  EXPECT_GT(overlapping, 300);
  EXPECT_GT(apart, 300);
}

// Pulled apart along a random direction beyond their bounding spheres: a separating axis exists
// among the fifteen, so the test must find it, and the gap it reports is a lower bound.
TEST(RKMMathOBBBase, SeparatedBoxesAreDisjointAndDistancesAreBounds)
{
  Rng g(15);
  SCOPED_TRACE("seed 15");
  for (int n = 0; n < 500; ++n)
  {
    const RKMMathOBBBase a = RandomBox(g);
    RKMMathOBBBase b = RandomBox(g);
    const double gap = Uniform(g, 1e-3, 2);
    const RKMMathVector dir = RandomUnit(g);
    const RKMMathPoint c = a.Center() + dir * (a.Diagonal().Norm() + b.Diagonal().Norm() + gap);
    const RKMMathVector axes[3] = {b.U(), b.V(), b.W()};
    b = RKMMathOBBBase(axes, b.Diagonal(), c);
    EXPECT_FALSE(a.IsIntersecting(b)) << "pair " << n;
    const double lower = a.SquareDistanceTo(b), upper = a.MaxSquareDistanceTo(b);
    EXPECT_GT(lower, 0.0) << "pair " << n;
    EXPECT_NEAR(lower, b.SquareDistanceTo(a), 1e-9 * (1 + lower));
    double trueMax = 0;
    for (const RKMMathPoint &ca : Corners(a))
      for (const RKMMathPoint &cb : Corners(b))
        trueMax = std::max(trueMax, ca.SquareDistanceTo(cb));
    EXPECT_GE(upper, trueMax);
    EXPECT_LE(upper, trueMax * (1 + 1e-9));
    for (int s = 0; s < 100; ++s)
    {
      const double d2 = SampleBox(g, a).SquareDistanceTo(SampleBox(g, b));
      ASSERT_LE(lower, d2) << "pair " << n;
      ASSERT_GE(upper, d2) << "pair " << n;
    }
  }
  // Sharing their axes, the boxes are separated along a face axis and the bound is the exact gap.
  const RKMMath3x3Matrix R = RandomRotation(g);
  const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
  const RKMMathOBBBase a(axes, RKMMathVector(1, 2, 3), RKMMathPoint(1, 1, 1));
  const RKMMathOBBBase b(axes, RKMMathVector(0.5, 1, 1), RKMMathPoint(1, 1, 1) + axes[0] * 3.5 + axes[1] * 0.5);
  EXPECT_NEAR(a.SquareDistanceTo(b), 4.0, 1e-9);
}

TEST(RKMMathOBBBase, PointDistancesBracketTheTrueOnes)
{
  Rng g(16);
  SCOPED_TRACE("seed 16");
  for (int n = 0; n < 2000; ++n)
  {
    const RKMMathOBBBase b = RandomBox(g);
    const RKMMathPoint p = n % 4 == 0 ? SampleBox(g, b) : RandomPoint(g, 8);
    const double d2 = TrueSquareDistance(b, p), m2 = TrueMaxSquareDistance(b, p);
    const double lib = b.SquareDistanceTo(p), libMax = b.MaxSquareDistanceTo(p);
    EXPECT_LE(lib, d2) << n;
    EXPECT_GE(lib, d2 * (1 - 1e-9) - 1e-12) << n;
    EXPECT_GE(libMax, m2) << n;
    EXPECT_LE(libMax, m2 * (1 + 1e-9)) << n;
  }
}

TEST(RKMMathOBBBase, AbsorbContainsBothBoxes)
{
  Rng g(17);
  SCOPED_TRACE("seed 17");
  for (int n = 0; n < 500; ++n)
  {
    const RKMMathOBBBase a = RandomBox(g), b = RandomBox(g);
    RKMMathOBBBase merged = a;
    const HRESULT hr = merged.Absorb(b);
    EXPECT_EQ(hr, S_OK);
    for (int i = 0; i < 3; ++i)
      EXPECT_EQ(merged.Axis(i), a.Axis(i));
    for (const RKMMathOBBBase *box : std::initializer_list<const RKMMathOBBBase *>{&a, &b})
      for (const RKMMathPoint &c : Corners(*box))
        EXPECT_TRUE(Inside(merged, c)) << "pair " << n;
    RKMMathOBBBase again = merged;
    EXPECT_EQ(again.Absorb(b), S_FALSE);
    EXPECT_EQ(again.Diagonal(), merged.Diagonal());

    // A box built inside a, with other axes, is already held.
    const double m = std::min({a.Diagonal().x, a.Diagonal().y, a.Diagonal().z}) / 2;
    const RKMMath3x3Matrix R = RandomRotation(g);
    const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
    RKMMathOBBBase target = a;
    EXPECT_EQ(target.Absorb(RKMMathOBBBase(axes, RKMMathVector(m, m, m) * 0.5, a.Center())), S_FALSE);
    EXPECT_EQ(target.Diagonal(), a.Diagonal());
    EXPECT_EQ(target.Center(), a.Center());

    RKMMathOBBBase undefined;
    EXPECT_EQ(undefined.Absorb(b), S_OK);
    EXPECT_EQ(undefined.Center(), b.Center());
    EXPECT_EQ(undefined.Diagonal(), b.Diagonal());
  }
}

TEST(RKMMathOBBBase, GetBoxEnclosesTightly)
{
  Rng g(18);
  SCOPED_TRACE("seed 18");
  for (int n = 0; n < 500; ++n)
  {
    const RKMMathOBBBase b = RandomBox(g, n % 2 ? 5.0 : 1e6);
    RKMMathBox box;
    b.GetBox(box);
    double lo[3] = {RKMdoubleMax, RKMdoubleMax, RKMdoubleMax}, hi[3] = {-RKMdoubleMax, -RKMdoubleMax, -RKMdoubleMax};
    for (const RKMMathPoint &c : Corners(b))
    {
      EXPECT_TRUE(box.IsContaining(c)) << n;
      for (int i = 0; i < 3; ++i)
        lo[i] = std::min(lo[i], c[i]), hi[i] = std::max(hi[i], c[i]);
    }
    const RKMMathPoint l = box.GetLow(), h = box.GetHigh();
    for (int i = 0; i < 3; ++i)
    {
      EXPECT_GE(l[i], lo[i] - 1e-9 * (1 + std::fabs(lo[i]))) << n;
      EXPECT_LE(h[i], hi[i] + 1e-9 * (1 + std::fabs(hi[i]))) << n;
    }
  }
}

TEST(RKMMathOBBBase, FramesConvertAndRoundTrip)
{
  Rng g(19);
  SCOPED_TRACE("seed 19");
  for (int n = 0; n < 300; ++n)
  {
    const RKMMathOBBBase b = RandomBox(g);
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
      const RKMMathPoint local((k & 1 ? 1 : -1) * h.x, (k & 2 ? 1 : -1) * h.y, (k & 4 ? 1 : -1) * h.z);
      EXPECT_LT((T * local).DistanceTo(FromLocal(b, local.x, local.y, local.z)), 1e-12);
    }
    const RKMMathPoint p = RandomPoint(g, 10);
    EXPECT_LT(b.UVWtoXYZ(b.XYZtoUVW(p)).DistanceTo(p), 1e-12);
    EXPECT_LT(b.XYZtoUVW(b.UVWtoXYZ(p)).DistanceTo(p), 1e-12);
    EXPECT_LT(b.UVWtoXYZ(p).DistanceTo(FromLocal(b, p.x, p.y, p.z)), 1e-12);
  }
}

TEST(RKMMathOBBBase, TransformedBoxEnclosesTheImage)
{
  Rng g(20);
  SCOPED_TRACE("seed 20");
  for (TKind kind : kAllTKinds)
  {
    SCOPED_TRACE(Name(kind));
    for (int n = 0; n < 300; ++n)
    {
      const RKMMathOBBBase b = RandomBox(g);
      const RKMMathTransformation T = RandomTransformation(g, kind);
      const RKMMathOBBBase image = T * b;
      ASSERT_TRUE(image.IsDefined());
      for (int s = 0; s < 30; ++s)
        ASSERT_TRUE(Inside(image, T * SampleBox(g, b))) << "box " << n;
      for (int i = 0; kind == TKind::Rigid && i < 3; ++i)
        EXPECT_NEAR(image.Diagonal()[i], b.Diagonal()[i], 1e-9) << "a rigid motion keeps the size";
    }
  }
  // A flattening map still gives a box holding the (flat) image.
  const RKMMathTransformation flatten(RKMMath3x3Matrix(1, 0, 0, 0, 1, 0, 0, 0, 0), RKMMathVector(1, 2, 3));
  for (int n = 0; n < 100; ++n)
  {
    const RKMMathOBBBase b = RandomBox(g);
    const RKMMathOBBBase image = flatten * b;
    for (int s = 0; s < 20; ++s)
      EXPECT_TRUE(Inside(image, flatten * SampleBox(g, b)));
  }
}

TEST(RKMMathPlaneLine, NormalDistanceAndProjection)
{
  const RKMMathPlane xy;
  EXPECT_EQ(xy.GetNormal(), RKMMathVector(0, 0, 1));
  EXPECT_DOUBLE_EQ(xy.DistanceTo(RKMMathPoint(3, -4, -2.5)), 2.5);
  const RKMMathPlane p(RKMMathPoint(1, 1, 1), RKMMathVector(0, 3, 0), RKMMathVector(0, 0, 0.5));
  EXPECT_EQ(p.GetNormal(), RKMMathVector(1, 0, 0));
  EXPECT_DOUBLE_EQ(p.DistanceTo(RKMMathPoint(-2, 7, 9)), 3.0);
  const RKMMathPlane tilted(RKMMathPoint(0, 0, 0), RKMMathVector(1, 1, 0), RKMMathVector(0, 0, 1));
  const RKMMathVector n = tilted.GetNormal();
  EXPECT_NEAR(n.Norm(), 1.0, 1e-15);
  EXPECT_NEAR(n.x, std::sqrt(0.5), 1e-15);
  EXPECT_NEAR(n.y, -std::sqrt(0.5), 1e-15);
  EXPECT_NEAR(tilted.DistanceTo(RKMMathPoint(1, 0, 5)), std::sqrt(0.5), 1e-15);
  // Parallel directions span no plane: no normal, and the distance falls back to the origin.
  const RKMMathPlane degenerate(RKMMathPoint(1, 0, 0), RKMMathVector(1, 2, 3), RKMMathVector(2, 4, 6));
  EXPECT_EQ(degenerate.GetNormal(), RKMMathVector());
  EXPECT_DOUBLE_EQ(degenerate.DistanceTo(RKMMathPoint(4, 4, 0)), 5.0);

  const RKMMathLine line(RKMMathPoint(1, 2, 3), RKMMathVector(0, 0, 7));
  EXPECT_EQ(line.Project(RKMMathPoint(4, 6, -1)), RKMMathPoint(1, 2, -1));
  EXPECT_DOUBLE_EQ(line.SquareDistanceTo(RKMMathPoint(4, 6, -1)), 25.0);
  EXPECT_DOUBLE_EQ(line.DistanceTo(RKMMathPoint(4, 6, -1)), 5.0);
  const RKMMathLine null(RKMMathPoint(1, 1, 1), RKMMathVector());
  EXPECT_EQ(null.Project(RKMMathPoint(5, 5, 5)), RKMMathPoint(1, 1, 1));
  EXPECT_DOUBLE_EQ(null.SquareDistanceTo(RKMMathPoint(1, 1, 3)), 4.0);
  Rng g(21);
  for (int n = 0; n < 100; ++n)
  {
    const RKMMathLine l(RandomPoint(g, 5), RandomUnit(g) * Uniform(g, 0.1, 10));
    const RKMMathPoint q = RandomPoint(g, 5), f = l.Project(q);
    EXPECT_NEAR((q - f) * l.GetDirection(), 0.0, 1e-10);
    EXPECT_NEAR(l.SquareDistanceTo(q), q.SquareDistanceTo(f), 1e-12);
    EXPECT_LE(l.DistanceTo(q), q.DistanceTo(l.GetOrigin()) + 1e-12);
  }
}
}
