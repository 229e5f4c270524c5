#include "RKMPolyBVTestUtil.h"

#include "RKMPolyBVConstVisitor.h"

#include "RKMMathConstants.h"
#include "RKMMathDirection.h"

#include <gtest/gtest.h>

#include <limits>

namespace
{
using namespace bvtest;
using Dir = RKMMathDirection;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

struct KindRecorder : RKMPolyBVConstVisitor
{
  int seen = -1;
  HRESULT VisitConcrete(const RKMPolyBoundingCylinder &) override { return Record(4); }
  HRESULT VisitConcrete(const RKMPolyBoundingPlane &) override { return Record(3); }
  HRESULT VisitConcrete(const RKMPolyOBB &) override { return Record(2); }
  HRESULT VisitConcrete(const RKMPolyAABB &) override { return Record(0); }
  HRESULT VisitConcrete(const RKMPolyBoundingSphere &) override { return Record(1); }
  HRESULT Record(int k) { return 100 + (seen = k); }
};

// The brute-force answer: samples the ray every 0.01 up to 25.
bool MarchHits(const RKMPolyBoundingVolume &bv, const RKMMathPoint &o, const RKMMathVector &d)
{
  for (double t = 0; t <= 25.0; t += 0.01)
    if (P::IsPointInsideBV(bv, o + d * t))
      return true;
  return false;
}

TEST(RKMPolyBoundingVolume, KindsDispatchAndClone)
{
  Rng g(31);
  const int expectedType[kVKindCount] = {0, 1, 2, 3, 4, 4};
  for (int k = 0; k < kVKindCount; ++k)
  {
    SCOPED_TRACE(std::string(Name(k)) + ", seed 31");
    const BVPtr bv = RandomVolume(g, k), copy = Clone(*bv);
    KindRecorder r;
    EXPECT_EQ(static_cast<int>(bv->GetTypeID()), expectedType[k]);
    EXPECT_EQ(r.Visit(*bv), 100 + expectedType[k]);
    EXPECT_EQ(r.seen, expectedType[k]);
    ASSERT_TRUE(copy && copy.get() != bv.get());
    EXPECT_TRUE(Same(*copy, *bv));
    for (int s = 0; s < 50; ++s)
    {
      const RKMMathPoint p = RandomPoint(g, 6);
      EXPECT_EQ(P::IsPointInsideBV(*copy, p), P::IsPointInsideBV(*bv, p));
    }
  }
  const UnknownBV unknown;
  EXPECT_TRUE(RKMPolyBVClone::Clone(nullptr) == nullptr && RKMPolyBVClone::Clone(&unknown) == nullptr);
  // An inverted box is copied as the canonical empty box.
  const BVPtr emptyCopy = Clone(RKMPolyAABB(RKMPolyBoxf(5.f, 4.f, 0.f, 1.f, 0.f, 1.f)));
  ASSERT_NE(emptyCopy, nullptr);
  const RKMPolyBoxf &b = static_cast<const RKMPolyAABB &>(*emptyCopy).GetBoxf();
  EXPECT_TRUE(b.GetXMin() == 1.f && b.GetYMin() == 1.f && b.GetZMin() == 1.f && b.GetXMax() == -1.f &&
              b.GetYMax() == -1.f && b.GetZMax() == -1.f);
}

TEST(RKMPolyBVProperties, TableOfSizes)
{
  const RKMMathVector axes[3] = {{0, 1, 0}, {0, 0, 1}, {1, 0, 0}};
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 2, 0, 4));
  const RKMPolyBoundingSphere unit({1, 2, 3}, 1.0), two({}, 2.0);
  const RKMPolyOBB obb(axes, RKMMathVector(0.5, 1, 2), RKMMathPoint(-1, 0, 1));
  const RKMPolyBoundingPlane slab({0, 0, 1}, {0, 0, 7}, 0.01);
  const RKMPolyBoundingCylinder capsule({1, 1, 1}, {0, 1, 0}, 2.0, 3.0), infinite({}, {0, 1, 0}, 2.0, -1.0);
  // Radius and volume with their tolerances (0: to the ulp), centre.
  const struct
  {
    const RKMPolyBoundingVolume &bv;
    double radius, rEps, volume, vEps;
    RKMMathPoint center;
  } cases[] = {{box, 3.48, 1e-5, 8.0, 1e-5, {0.5, 1, 2}},  {unit, 1.0, 0, RKMPI * 1.3333, 0, {1, 2, 3}},
               {two, 2.0, 0, RKMPI * 1.3333 * 8, 0, {}},   {obb, 0.87 * 4, 1e-9, 8.0, 0, {-1, 0, 1}},
               {slab, 1e40, 0, 1e58, 1e44, {0, 0, 7}},     {capsule, 5.0, 0, 4.0 * RKMPI * 3.0, 0, {1, 1, 1}},
               {infinite, RKMMathInfinite, 0, 1e30, 0, {}}};
  auto near = [](double v, double expected, double eps)
  { return v == expected || std::fabs(v - expected) <= eps + 4e-16 * std::fabs(expected); };
  for (const auto &c : cases)
  {
    EXPECT_FALSE(P::IsEmpty(&c.bv)) << &c - cases;
    EXPECT_TRUE(near(P::GetRadius(&c.bv), c.radius, c.rEps)) << &c - cases << ": " << P::GetRadius(&c.bv);
    EXPECT_TRUE(near(P::GetVolume(&c.bv), c.volume, c.vEps)) << &c - cases << ": " << P::GetVolume(&c.bv);
    EXPECT_LT(P::GetCenter(&c.bv).DistanceTo(c.center), 1e-6) << &c - cases;
  }
}

// Empty volumes never rank as having a (negative) size, which would sort them first in the hierarchy
// builders; they contain nothing, not even their centre, and no ray reaches them.
TEST(RKMPolyBVProperties, EmptyVolumesHaveNoSize)
{
  const RKMMathVector axes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
  const RKMPolyAABB emptyBox;
  const RKMPolyBoundingSphere zero({}, 0.0), negative({1, 1, 1}, -2.0), nanSphere({}, kNaN);
  const RKMPolyOBB undefinedOBB, badOBB(axes, RKMMathVector(1, -1, 1), RKMMathPoint()); // any axis, not the first only
  const RKMPolyBoundingPlane flat({0, 0, 1}, {}, 0.0), nanSlab({0, 0, 1}, {}, kNaN);
  const RKMPolyBoundingCylinder negCapsule({}, {1, 0, 0}, -1.0, 2.0), negInfinite({}, {1, 0, 0}, -1.0, -1.0);
  const UnknownBV unknown;
  for (const RKMPolyBoundingVolume *bv : BVs{&emptyBox, &zero, &negative, &nanSphere, &undefinedOBB, &badOBB, &flat,
                                             &nanSlab, &negCapsule, &negInfinite, &unknown, nullptr})
    EXPECT_TRUE(P::IsEmpty(bv) && P::GetRadius(bv) == 0.0 && P::GetVolume(bv) == 0.0) << (bv ? bv->GetTypeID() : -1);
  for (const RKMPolyBoundingVolume *bv : BVs{nullptr, &unknown, &emptyBox})
    EXPECT_EQ(P::GetCenter(bv), RKMMathPoint(0, 0, 0));
  for (const RKMPolyBoundingVolume *bv : BVs{&negative, &negCapsule, &negInfinite, &emptyBox, &undefinedOBB, &badOBB})
    EXPECT_FALSE(P::IsPointInsideBV(*bv, P::GetCenter(bv)) || P::IsPointInsideBV(*bv, RKMMathPoint()) ||
                 P::IsRayIntersectingBV(*bv, RKMMathPoint(-5, 1, 1), Dir(1, 0, 0)) ||
                 P::IsRayIntersectingBV(*bv, P::GetCenter(bv), Dir(0, 1, 0)))
        << bv->GetTypeID();
  EXPECT_FALSE(P::IsPointInsideBV(unknown, RKMMathPoint()) || P::IsRayIntersectingBV(unknown, RKMMathPoint(), Dir()));
}

// Containment is closed; a cylinder of limit 0 is infinite here; an infinitely thick slab is all space.
TEST(RKMPolyBVProperties, ClosedContainment)
{
  const RKMPolyBoundingCylinder capsule({}, {1, 0, 0}, 1.0, 1.0), zeroLimit({}, {1, 0, 0}, 1.0, 0.0),
      infinite({}, {0, 0, 1}, 1.0, -1.0);
  const RKMPolyBoundingSphere sphere({1, 0, 0}, 2.0);
  const RKMPolyBoundingPlane slab({0, 0, 1}, {}, 1.0);
  RKMPolyBoundingPlane allSpace(slab);
  allSpace.SetInfinitelyThick(1);
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1));
  const struct
  {
    const RKMPolyBoundingVolume &bv;
    RKMMathPoint p;
    bool inside;
  } cases[] = {{capsule, {1.5, 0, 0}, true},     {capsule, {2, 0, 0}, true},      {capsule, {-0.5, 0, 1}, true},
               {capsule, {2.5, 0, 0}, false},    {capsule, {1.8, 0.8, 0}, false}, {capsule, {0, 1.01, 0}, false},
               {zeroLimit, {100, 0.5, 0}, true}, {infinite, {0, 1, -1e6}, true},  {infinite, {0, 1.001, 0}, false},
               {sphere, {3, 0, 0}, true},        {sphere, {3.001, 0, 0}, false},  {sphere, {-1.001, 0, 0}, false},
               {slab, {1e6, -1e6, -1}, true},    {slab, {0, 0, 1.001}, false},    {allSpace, {0, 0, 1e9}, true},
               {box, {1, 1, 0}, true},           {box, {1.001, 0.5, 0.5}, false}};
  for (const auto &c : cases)
    EXPECT_EQ(P::IsPointInsideBV(c.bv, c.p), c.inside) << "case " << &c - cases;
}

TEST(RKMPolyBVProperties, RaysAgreeWithAMarch)
{
  Rng g(32);
  for (int k = 0; k < kVKindCount; ++k)
  {
    SCOPED_TRACE(std::string(Name(k)) + ", seed 32");
    int hits = 0;
    for (int n = 0; n < 200; ++n)
    {
      const BVPtr bv = RandomVolume(g, k);
      const RKMMathPoint o = RandomPoint(g, 8);
      // Half the rays aim at the volume, so both answers are exercised.
      const RKMMathVector toward = SampleInside(g, *bv, 5.0) - o;
      const Dir d(n % 2 ? toward + RandomUnit(g) * (0.05 * toward.Norm()) : RandomUnit(g));
      const bool hit = P::IsRayIntersectingBV(*bv, o, d);
      hits += hit;
      EXPECT_TRUE(hit || !MarchHits(*bv, o, d)) << "ray " << n << " enters the volume but is reported missing it";
      // Bounded volumes: a reported hit is within a hair of the volume, where the grown one holds a
      // stretch of the ray longer than the march step.
      if (!hit || Unbounded(k))
        continue;
      const BVPtr grown = Clone(*bv);
      RKMPolyBVOperations::Inflate(*grown, 0.05);
      EXPECT_TRUE(MarchHits(*grown, o, d)) << "ray " << n << " reported hitting from afar";
    }
    EXPECT_TRUE(hits > 20 && hits < 180) << hits;
  }
}

TEST(RKMPolyBVProperties, RayEdgeCases)
{
  const RKMPolyBoundingSphere unit({}, 1.0);
  const RKMPolyAABB box(RKMMathBox(-1, 2, -1, 2, -1, 2));
  // The slab test reads the thickness even when infinitely thick: pointing away from it misses.
  const RKMPolyBoundingPlane slab({0, 0, 1}, {}, 1.0);
  RKMPolyBoundingPlane thick(slab);
  thick.SetInfinitelyThick(1);
  // Containment reads a limit of 0 as infinite, so a ray from inside hits it; at an angle of 5e-6, a
  // ray crosses the axis of a long cylinder 4e5 away, where it is inside. A capsule's axis line met
  // behind the origin is no hit.
  const RKMPolyBoundingCylinder capsule({}, {1, 0, 0}, 1.0, 1.0), zeroLimit({}, {1, 0, 0}, 1.0, 0.0),
      infinite({}, {1, 0, 0}, 1.0, -1.0);
  const struct
  {
    const RKMPolyBoundingVolume &bv;
    RKMMathPoint o;
    Dir d;
    bool hit;
  } cases[] = {{unit, {1, 0, 0}, {1, 0, 0}, true},          {unit, {1.001, 0, 0}, {1, 0, 0}, false},
               {unit, {-3, 1, 0}, {1, 0, 0}, true},         {unit, {3, 0, 0}, {1, 1e-3, 0}, false},
               {box, {0, 0, 0}, {0, 0, 1}, true},           {box, {0, 0, 0}, {0, -1, 0}, true},
               {box, {0, 0, 0}, {0, 0, 0}, true},           {box, {2.5, 0, 0}, {1, 0, 0}, false},
               {box, {2.5, 0, 0}, {-1, 0, 0}, true},        {box, {-5, 2.5, 0}, {1, 0, 0}, false},
               {slab, {0, 0, 5}, {1, 0, -1e-3}, true},      {slab, {0, 0, 5}, {1, 0, 0}, false},
               {slab, {0, 0, 0.5}, {0, 0, 1}, true},        {thick, {0, 0, 5}, {0, 0, 1}, false},
               {capsule, {5, 0, 0}, {-1, 0, 0}, true},      {capsule, {2.5, 0, 0}, {1, 0, 0}, false},
               {capsule, {2.5, 0, -3}, {-0.5, 0, 3}, true}, {capsule, {3, 0, -3}, {0, 0, 1}, false},
               {capsule, {0.5, 0, 3}, {0, 0, 1}, false},    {capsule, {0.5, -3, 3}, {0, -1, 1}, false},
               {zeroLimit, {5, 0, 0}, {0, 1, 0}, true},     {infinite, {0, 2, 0}, {1, -5e-6, 0}, true}};
  for (const auto &c : cases)
    EXPECT_EQ(P::IsRayIntersectingBV(c.bv, c.o, c.d), c.hit) << "case " << &c - cases;
  Rng g(33);
  for (int n = 0; n < 200; ++n)
    EXPECT_TRUE(P::IsRayIntersectingBV(box, RKMMathPoint(0.5, 0.5, 0.5) + RandomUnit(g), Dir(RandomUnit(g))))
        << "from inside, seed 33, ray " << n;
}

// Zero becomes x; huge, tiny and subnormal vectors keep their direction; a vector whose squared length
// rounds to exactly 1 is kept bit for bit. Set keeps the old limit unless given a positive one.
TEST(RKMPolyBoundingCylinder, DirectionRule)
{
  auto normalized = [](RKMMathVector v)
  {
    RKMPolyBoundingCylinder::NormalizeDirection(v);
    return v;
  };
  const RKMMathVector unitish(0.6, 0.8, 0);
  const std::pair<RKMMathVector, RKMMathVector> cases[] = {
      {{0, 0, 0}, {1, 0, 0}},      {{0, 0, 2}, {0, 0, 1}},        {{1e200, 0, 0}, {1, 0, 0}},
      {{0, 1e-170, 0}, {0, 1, 0}}, {{0, -3e-320, 0}, {0, -1, 0}}, {{3e200, -4e200, 0}, {0.6, -0.8, 0}}};
  for (const auto &[v, expected] : cases)
    EXPECT_LT((normalized(v) - expected).Norm(), 1e-15) << v.x << " " << v.y << " " << v.z;
  EXPECT_TRUE(std::isnan(normalized(RKMMathVector(kNaN, 1, 0)).x));
  EXPECT_TRUE(unitish.SquareNorm() != 1.0 || normalized(unitish) == unitish);
  Rng g(34);
  for (int n = 0; n < 200; ++n)
  {
    const RKMMathVector u = RandomUnit(g), v = normalized(u * std::pow(10.0, Uniform(g, -250, 250)));
    EXPECT_TRUE(std::fabs(v.Norm() - 1.0) <= 1e-15 && (v - u).Norm() < 1e-14) << "seed 34, vector " << n;
  }
  EXPECT_EQ(RKMPolyBoundingCylinder({}, {}, 1, 1).GetDirection(), RKMMathVector(1, 0, 0));
  RKMPolyBoundingCylinder c({}, {0, 3, 0}, 1.0, 2.0);
  EXPECT_EQ(c.GetDirection(), RKMMathVector(0, 1, 0));
  c.Set({1, 1, 1}, {0, 0, -5}, 0.5, 0.0);
  EXPECT_TRUE(c.GetLimit() == 2.0 && c.GetDirection() == RKMMathVector(0, 0, -1));
  c.Set({}, {1, 0, 0}, 0.5, -3.0);
  EXPECT_EQ(c.GetLimit(), 2.0);
  c.Set({}, {1, 0, 0}, 0.5, 4.0);
  EXPECT_EQ(c.GetLimit(), 4.0);
  EXPECT_TRUE(RKMPolyBoundingCylinder({}, {1, 0, 0}, 1, -1).IsInfinite() && RKMPolyBoundingCylinder().IsInfinite());
}

TEST(RKMPolyBoundingPlane, ThicknessEquationAndDistance)
{
  RKMPolyBoundingPlane slab({0, 0, 4}, {}, -1.0);
  EXPECT_TRUE(slab.GetNormal() == RKMMathVector(0, 0, 1) && slab.GetThickness() == 1.0);
  EXPECT_TRUE(slab.DistanceTo({5, 5, 3}) == 2.0 && slab.SquareDistanceTo({5, 5, 3}) == 4.0);
  EXPECT_TRUE(slab.DistanceTo({5, 5, -3}) == 2.0 && slab.DistanceTo({9, -9, 0.5}) == 0.0);
  slab.SetThickness(-2.5);
  EXPECT_EQ(slab.GetThickness(), 2.5);
  slab.Inflate(0.5);
  EXPECT_EQ(slab.GetThickness(), 3.0);
  slab.Inflate(-10);
  EXPECT_EQ(slab.GetThickness(), 0.0);
  slab.SetInfinitelyThick(1);
  EXPECT_EQ(slab.DistanceTo({0, 0, 1e9}), 0.0);
  double a, b, c, d;
  RKMPolyBoundingPlane({0, 0, 1}, {0, 0, 2}, 1.0).GetEquation(a, b, c, d);
  EXPECT_TRUE(a == 0.0 && b == 0.0 && c == 1.0 && d == -2.0);
  const RKMPolyBoundingPlane byDefault;
  EXPECT_TRUE(byDefault.GetNormal() == RKMMathVector(0, 0, 1) && byDefault.GetThickness() == 0.01 &&
              !byDefault.IsInfinitelyThick());
}

// NaN anywhere must not crash nor produce a size that ranks, or a negative one; the float box leaves a
// NaN side open instead of losing geometry.
TEST(RKMPolyBoundingVolume, NaNInputGivesNeutralAnswers)
{
  const RKMMathPoint nanPoint(kNaN, 0, 0);
  const RKMMathVector axes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
  BVPtr volumes[] = {BVPtr(new RKMPolyAABB(RKMMathBox(kNaN, 1, 0, 1, 0, 1))),
                     BVPtr(new RKMPolyBoundingSphere(nanPoint, 1.0)),
                     BVPtr(new RKMPolyOBB(axes, RKMMathVector(1, 1, 1), nanPoint)),
                     BVPtr(new RKMPolyBoundingPlane(RKMMathVector(kNaN, 0, 1), nanPoint, 1.0)),
                     BVPtr(new RKMPolyBoundingCylinder(nanPoint, RKMMathVector(kNaN, 1, 0), 1.0, 1.0)),
                     BVPtr(new RKMPolyBoundingCylinder(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, kNaN))};
  EXPECT_TRUE(P::IsPointInsideBV(*volumes[0], RKMMathPoint(-1e30, 0.5, 0.5)));
  const RKMMathTransformation shift(RKMMathVector(1, 2, 3));
  for (BVPtr &bv : volumes)
  {
    EXPECT_FALSE(P::GetRadius(bv.get()) < 0.0 || P::GetVolume(bv.get()) < 0.0) << bv->GetTypeID();
    P::IsEmpty(bv.get());
    P::GetCenter(bv.get());
    P::IsPointInsideBV(*bv, RKMMathPoint());
    P::IsPointInsideBV(*bv, RKMMathPoint(kNaN, kNaN, kNaN));
    P::IsRayIntersectingBV(*bv, RKMMathPoint(), Dir(0, 1, 0));
    P::IsRayIntersectingBV(*bv, RKMMathPoint(kNaN, 0, 0), Dir(0, 1, 0));
    RKMMathBox box;
    RKMPolyBVOperations::GetEnclosingBox(*bv, box, &shift);
    EXPECT_NE(Placed(*bv, &shift), nullptr) << bv->GetTypeID();
    RKMPolyBVOperations::Inflate(*bv, kNaN);
    RKMPolyBVOperations::Transform(*bv, RKMMathTransformation(RKMMath3x3Matrix(kNaN, 0, 0, 0, 1, 0, 0, 0, 1), {}));
    Clone(*bv);
  }
}
} // namespace
