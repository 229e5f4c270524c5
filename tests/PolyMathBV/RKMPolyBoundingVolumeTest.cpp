#include "RKMPolyBVTestUtil.h"

#include "RKMPolyBVClone.h"
#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBVProperties.h"

#include "RKMMathConstants.h"
#include "RKMMathDirection.h"

#include <gtest/gtest.h>

#include <cmath>
#include <initializer_list>
#include <limits>

namespace
{
using namespace bvtest;
using P = RKMPolyBVProperties;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
using BVList = std::initializer_list<const RKMPolyBoundingVolume *>;

// A kind the library does not know: every question must get the empty, neutral answer.
class UnknownBV : public RKMPolyBoundingVolume
{
public:
  HRESULT Accept(RKMPolyBVConstVisitor &) const override { return E_NOTIMPL; }
  TypeID GetTypeID() const override { return static_cast<TypeID>(7); }
};

struct KindRecorder : RKMPolyBVConstVisitor
{
  int seen = -1;
  HRESULT VisitConcrete(const RKMPolyBoundingCylinder &) override { return Record(4); }
  HRESULT VisitConcrete(const RKMPolyBoundingPlane &) override { return Record(3); }
  HRESULT VisitConcrete(const RKMPolyOBB &) override { return Record(2); }
  HRESULT VisitConcrete(const RKMPolyAABB &) override { return Record(0); }
  HRESULT VisitConcrete(const RKMPolyBoundingSphere &) override { return Record(1); }
  HRESULT Record(int k)
  {
    seen = k;
    return 100 + k;
  }
};

// The brute-force answer: samples the ray every `step` up to tMax.
bool MarchHits(const RKMPolyBoundingVolume &bv, const RKMMathPoint &o, const RKMMathVector &d, double tMax, double step)
{
  for (double t = 0; t <= tMax; t += step)
    if (P::IsPointInsideBV(bv, o + d * t))
      return true;
  return false;
}

TEST(RKMPolyBoundingVolume, KindsDispatchAndClone)
{
  Rng g(31);
  SCOPED_TRACE("seed 31");
  const int expectedType[kVKindCount] = {0, 1, 2, 3, 4, 4};
  for (int k = 0; k < kVKindCount; ++k)
  {
    SCOPED_TRACE(Name(k));
    const BVPtr bv = RandomVolume(g, k);
    ASSERT_NE(bv, nullptr);
    EXPECT_EQ(static_cast<int>(bv->GetTypeID()), expectedType[k]);
    KindRecorder r;
    EXPECT_EQ(r.Visit(*bv), 100 + expectedType[k]);
    EXPECT_EQ(r.seen, expectedType[k]);

    const BVPtr copy(RKMPolyBVClone::Clone(bv.get()));
    ASSERT_NE(copy, nullptr);
    EXPECT_NE(copy.get(), bv.get());
    EXPECT_EQ(copy->GetTypeID(), bv->GetTypeID());
    EXPECT_EQ(P::GetCenter(copy.get()), P::GetCenter(bv.get()));
    EXPECT_EQ(P::GetRadius(copy.get()), P::GetRadius(bv.get()));
    EXPECT_EQ(P::GetVolume(copy.get()), P::GetVolume(bv.get()));
    for (int s = 0; s < 50; ++s)
    {
      const RKMMathPoint p = RandomPoint(g, 6);
      EXPECT_EQ(P::IsPointInsideBV(*copy, p), P::IsPointInsideBV(*bv, p));
    }
  }
  EXPECT_EQ(RKMPolyBVClone::Clone(nullptr), nullptr);
  const UnknownBV unknown;
  EXPECT_EQ(RKMPolyBVClone::Clone(&unknown), nullptr);

  RKMPolyAABB inverted;
  inverted.SetBoxf(RKMPolyBoxf(5.f, 4.f, 0.f, 1.f, 0.f, 1.f));
  const BVPtr emptyCopy(RKMPolyBVClone::Clone(&inverted));
  ASSERT_NE(emptyCopy, nullptr);
  const RKMPolyBoxf &b = static_cast<const RKMPolyAABB &>(*emptyCopy).GetBoxf();
  EXPECT_EQ(b.GetXMin(), 1.f);
  EXPECT_EQ(b.GetYMin(), 1.f);
  EXPECT_EQ(b.GetZMin(), 1.f);
  EXPECT_EQ(b.GetXMax(), -1.f);
  EXPECT_EQ(b.GetYMax(), -1.f);
  EXPECT_EQ(b.GetZMax(), -1.f);
}

TEST(RKMPolyBVProperties, TableOfSizes)
{
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 2, 0, 4));
  EXPECT_NEAR(P::GetRadius(&box), 3.48, 1e-5);
  EXPECT_NEAR(P::GetVolume(&box), 8.0, 1e-5);
  EXPECT_NEAR(P::GetCenter(&box).z, 2.0, 1e-6);

  const RKMPolyBoundingSphere unit(RKMMathPoint(1, 2, 3), 1.0), two(RKMMathPoint(), 2.0);
  EXPECT_DOUBLE_EQ(P::GetVolume(&unit), RKMPI * 1.3333);
  EXPECT_DOUBLE_EQ(P::GetVolume(&two), RKMPI * 1.3333 * 8);
  EXPECT_EQ(P::GetRadius(&unit), 1.0);
  EXPECT_EQ(P::GetCenter(&unit), RKMMathPoint(1, 2, 3));

  const RKMMathVector axes[3] = {{0, 1, 0}, {0, 0, 1}, {1, 0, 0}};
  const RKMPolyOBB obb(axes, RKMMathVector(0.5, 1, 2), RKMMathPoint(-1, 0, 1));
  EXPECT_DOUBLE_EQ(P::GetVolume(&obb), 8.0);
  EXPECT_NEAR(P::GetRadius(&obb), 0.87 * 4, 1e-9);
  EXPECT_EQ(P::GetCenter(&obb), RKMMathPoint(-1, 0, 1));

  const RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 1), RKMMathPoint(0, 0, 7), 0.01);
  EXPECT_NEAR(P::GetVolume(&slab), 1e58, 1e44);
  EXPECT_EQ(P::GetRadius(&slab), 1e40);
  EXPECT_EQ(P::GetCenter(&slab), RKMMathPoint(0, 0, 7));

  const RKMPolyBoundingCylinder capsule(RKMMathPoint(1, 1, 1), RKMMathVector(0, 1, 0), 2.0, 3.0);
  EXPECT_DOUBLE_EQ(P::GetVolume(&capsule), 4.0 * RKMPI * 3.0);
  EXPECT_EQ(P::GetRadius(&capsule), 5.0);
  EXPECT_EQ(P::GetCenter(&capsule), RKMMathPoint(1, 1, 1));
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(), RKMMathVector(0, 1, 0), 2.0, -1.0);
  EXPECT_EQ(P::GetVolume(&infinite), 1e30);
  EXPECT_EQ(P::GetRadius(&infinite), RKMMathInfinite);

  for (const RKMPolyBoundingVolume *bv : BVList{&box, &unit, &obb, &slab, &capsule, &infinite})
    EXPECT_FALSE(P::IsEmpty(bv));
}

// Empty volumes must never rank as having a (negative) size: a negative volume would sort first in
// the hierarchy builders.
TEST(RKMPolyBVProperties, EmptyVolumesHaveNoSize)
{
  const RKMPolyAABB emptyBox;
  const RKMPolyBoundingSphere zero(RKMMathPoint(), 0.0), negative(RKMMathPoint(1, 1, 1), -2.0), nanSphere(RKMMathPoint(), kNaN);
  const RKMPolyOBB undefinedOBB;
  const RKMPolyBoundingPlane flat(RKMMathVector(0, 0, 1), RKMMathPoint(), 0.0), nanSlab(RKMMathVector(0, 0, 1), RKMMathPoint(), kNaN);
  const RKMPolyBoundingCylinder negCapsule(RKMMathPoint(), RKMMathVector(1, 0, 0), -1.0, 2.0);
  const RKMPolyBoundingCylinder negInfinite(RKMMathPoint(), RKMMathVector(1, 0, 0), -1.0, -1.0);
  const UnknownBV unknown;
  for (const RKMPolyBoundingVolume *bv :
       BVList{&emptyBox, &zero, &negative, &nanSphere, &undefinedOBB, &flat, &nanSlab, &negCapsule, &negInfinite, &unknown, nullptr})
  {
    EXPECT_TRUE(P::IsEmpty(bv));
    EXPECT_EQ(P::GetRadius(bv), 0.0);
    EXPECT_EQ(P::GetVolume(bv), 0.0);
  }
  EXPECT_EQ(P::GetCenter(nullptr), RKMMathPoint(0, 0, 0));
  EXPECT_EQ(P::GetCenter(&unknown), RKMMathPoint(0, 0, 0));
  EXPECT_EQ(P::GetCenter(&emptyBox), RKMMathPoint(0, 0, 0));
  // Negative radii contain nothing, not even the centre, and no ray reaches them.
  for (const RKMPolyBoundingVolume *bv : BVList{&negative, &negCapsule, &negInfinite, &emptyBox, &undefinedOBB})
  {
    EXPECT_FALSE(P::IsPointInsideBV(*bv, P::GetCenter(bv)));
    EXPECT_FALSE(P::IsRayIntersectingBV(*bv, RKMMathPoint(-5, 1, 1), RKMMathDirection(1, 0, 0)));
    EXPECT_FALSE(P::IsRayIntersectingBV(*bv, P::GetCenter(bv), RKMMathDirection(0, 1, 0)));
  }
  EXPECT_FALSE(P::IsPointInsideBV(unknown, RKMMathPoint()));
  EXPECT_FALSE(P::IsRayIntersectingBV(unknown, RKMMathPoint(), RKMMathDirection()));
}

TEST(RKMPolyBVProperties, DegenerateOBBHalfSizesGiveNoNegativeVolume)
{
  // A negative half-size on any axis holds nothing, not only on the first.
  const RKMMathVector axes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
  const RKMPolyOBB bad(axes, RKMMathVector(1, -1, 1), RKMMathPoint());
  EXPECT_FALSE(P::IsPointInsideBV(bad, RKMMathPoint()));
  EXPECT_EQ(P::GetVolume(&bad), 0.0);
  EXPECT_TRUE(P::IsEmpty(&bad));
  EXPECT_GE(P::GetRadius(&bad), 0.0);
}

TEST(RKMPolyBVProperties, ClosedContainment)
{
  const RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 1.0);
  EXPECT_TRUE(P::IsPointInsideBV(capsule, RKMMathPoint(1.5, 0, 0)));
  EXPECT_TRUE(P::IsPointInsideBV(capsule, RKMMathPoint(2, 0, 0)));
  EXPECT_TRUE(P::IsPointInsideBV(capsule, RKMMathPoint(-0.5, 0, 1)));
  EXPECT_FALSE(P::IsPointInsideBV(capsule, RKMMathPoint(2.5, 0, 0)));
  EXPECT_FALSE(P::IsPointInsideBV(capsule, RKMMathPoint(1.8, 0.8, 0)));
  EXPECT_FALSE(P::IsPointInsideBV(capsule, RKMMathPoint(0, 1.01, 0)));
  // A limit of 0 counts as an infinite cylinder here.
  const RKMPolyBoundingCylinder zeroLimit(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 0.0);
  EXPECT_TRUE(P::IsPointInsideBV(zeroLimit, RKMMathPoint(100, 0.5, 0)));
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(), RKMMathVector(0, 0, 1), 1.0, -1.0);
  EXPECT_TRUE(P::IsPointInsideBV(infinite, RKMMathPoint(0, 1, -1e6)));
  EXPECT_FALSE(P::IsPointInsideBV(infinite, RKMMathPoint(0, 1.001, 0)));

  const RKMPolyBoundingSphere sphere(RKMMathPoint(1, 0, 0), 2.0);
  EXPECT_TRUE(P::IsPointInsideBV(sphere, RKMMathPoint(3, 0, 0)));
  EXPECT_FALSE(P::IsPointInsideBV(sphere, RKMMathPoint(3.001, 0, 0)));
  EXPECT_FALSE(P::IsPointInsideBV(sphere, RKMMathPoint(-1.001, 0, 0)));

  RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 1), RKMMathPoint(), 1.0);
  EXPECT_TRUE(P::IsPointInsideBV(slab, RKMMathPoint(1e6, -1e6, -1)));
  EXPECT_FALSE(P::IsPointInsideBV(slab, RKMMathPoint(0, 0, 1.001)));
  slab.SetInfinitelyThick(1);
  EXPECT_TRUE(P::IsPointInsideBV(slab, RKMMathPoint(0, 0, 1e9)));

  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1));
  EXPECT_TRUE(P::IsPointInsideBV(box, RKMMathPoint(1, 1, 0)));
  EXPECT_FALSE(P::IsPointInsideBV(box, RKMMathPoint(1.001, 0.5, 0.5)));
}

TEST(RKMPolyBVProperties, RaysAgreeWithAMarch)
{
  Rng g(32);
  SCOPED_TRACE("seed 32");
  for (int k = 0; k < kVKindCount; ++k)
  {
    SCOPED_TRACE(Name(k));
    int hits = 0, misses = 0;
    for (int n = 0; n < 200; ++n)
    {
      const BVPtr bv = RandomVolume(g, k);
      const RKMMathPoint o = RandomPoint(g, 8);
      // Half the rays aim at the volume, so both answers are exercised.
      const RKMMathVector toward = SampleInside(g, *bv, 5.0) - o;
      const RKMMathDirection d(n % 2 ? toward + RandomUnit(g) * (0.05 * toward.Norm()) : RandomUnit(g));
      const bool hit = P::IsRayIntersectingBV(*bv, o, d);
      hit ? ++hits : ++misses;
      if (MarchHits(*bv, o, d, 25.0, 0.01))
      {
        EXPECT_TRUE(hit) << "ray " << n << " enters the volume but is reported missing it";
      }
      if (hit && k != kSlab && k != kInfiniteCylinder)
      {
        // Bounded volumes: a reported hit is within a hair of the volume, where the grown one
        // holds a stretch of the ray longer than the march step.
        const BVPtr grown(RKMPolyBVClone::Clone(bv.get()));
        RKMPolyBVOperations::Inflate(*grown, 0.05);
        EXPECT_TRUE(MarchHits(*grown, o, d, 25.0, 0.01)) << "ray " << n << " reported hitting from afar";
      }
    }
    EXPECT_GT(hits, 20);
    EXPECT_GT(misses, 20);
  }
}

TEST(RKMPolyBVProperties, RayEdgeCases)
{
  const RKMPolyBoundingSphere unit(RKMMathPoint(), 1.0);
  EXPECT_TRUE(P::IsRayIntersectingBV(unit, RKMMathPoint(1, 0, 0), RKMMathDirection(1, 0, 0)));
  EXPECT_FALSE(P::IsRayIntersectingBV(unit, RKMMathPoint(1.001, 0, 0), RKMMathDirection(1, 0, 0)));
  EXPECT_TRUE(P::IsRayIntersectingBV(unit, RKMMathPoint(-3, 1, 0), RKMMathDirection(1, 0, 0)));
  EXPECT_FALSE(P::IsRayIntersectingBV(unit, RKMMathPoint(3, 0, 0), RKMMathDirection(1, 1e-3, 0)));

  const RKMPolyAABB box(RKMMathBox(-1, 2, -1, 2, -1, 2));
  Rng g(33);
  for (int n = 0; n < 200; ++n)
    EXPECT_TRUE(P::IsRayIntersectingBV(box, RKMMathPoint(0.5, 0.5, 0.5) + RandomUnit(g), RKMMathDirection(RandomUnit(g))));
  for (const RKMMathDirection &axis : {RKMMathDirection(0, 0, 1), RKMMathDirection(0, -1, 0), RKMMathDirection(0, 0, 0)})
    EXPECT_TRUE(P::IsRayIntersectingBV(box, RKMMathPoint(0, 0, 0), axis));
  EXPECT_FALSE(P::IsRayIntersectingBV(box, RKMMathPoint(2.5, 0, 0), RKMMathDirection(1, 0, 0)));
  EXPECT_TRUE(P::IsRayIntersectingBV(box, RKMMathPoint(2.5, 0, 0), RKMMathDirection(-1, 0, 0)));
  EXPECT_FALSE(P::IsRayIntersectingBV(box, RKMMathPoint(-5, 2.5, 0), RKMMathDirection(1, 0, 0)));

  // The slab test reads the thickness even when infinitely thick: pointing away from it misses.
  RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 1), RKMMathPoint(), 1.0);
  EXPECT_TRUE(P::IsRayIntersectingBV(slab, RKMMathPoint(0, 0, 5), RKMMathDirection(1, 0, -1e-3)));
  EXPECT_FALSE(P::IsRayIntersectingBV(slab, RKMMathPoint(0, 0, 5), RKMMathDirection(1, 0, 0)));
  EXPECT_TRUE(P::IsRayIntersectingBV(slab, RKMMathPoint(0, 0, 0.5), RKMMathDirection(0, 0, 1)));
  slab.SetInfinitelyThick(1);
  EXPECT_FALSE(P::IsRayIntersectingBV(slab, RKMMathPoint(0, 0, 5), RKMMathDirection(0, 0, 1)));

  const RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 1.0);
  EXPECT_TRUE(P::IsRayIntersectingBV(capsule, RKMMathPoint(5, 0, 0), RKMMathDirection(-1, 0, 0)));
  EXPECT_FALSE(P::IsRayIntersectingBV(capsule, RKMMathPoint(2.5, 0, 0), RKMMathDirection(1, 0, 0)));
  EXPECT_TRUE(P::IsRayIntersectingBV(capsule, RKMMathPoint(2.5, 0, -3), RKMMathDirection(-0.5, 0, 3)));
  EXPECT_FALSE(P::IsRayIntersectingBV(capsule, RKMMathPoint(3, 0, -3), RKMMathDirection(0, 0, 1)));
  // The line meets the axis, but behind the origin.
  EXPECT_FALSE(P::IsRayIntersectingBV(capsule, RKMMathPoint(0.5, 0, 3), RKMMathDirection(0, 0, 1)));
  EXPECT_FALSE(P::IsRayIntersectingBV(capsule, RKMMathPoint(0.5, -3, 3), RKMMathDirection(0, -1, 1)));
}

TEST(RKMPolyBVProperties, RayStartingInsideAZeroLimitCylinderHitsIt)
{
  // Containment reads a limit of 0 as an infinite cylinder, so this origin is inside.
  const RKMPolyBoundingCylinder c(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 0.0);
  ASSERT_TRUE(P::IsPointInsideBV(c, RKMMathPoint(5, 0, 0)));
  EXPECT_TRUE(P::IsRayIntersectingBV(c, RKMMathPoint(5, 0, 0), RKMMathDirection(0, 1, 0)));
}

TEST(RKMPolyBVProperties, NearlyParallelRayReachesALongCylinder)
{
  // At an angle of 5e-6 the ray crosses the axis 4e5 away, where it is inside.
  const RKMPolyBoundingCylinder c(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, -1.0);
  const RKMMathPoint o(0, 2, 0);
  const RKMMathDirection d(1, -5e-6, 0);
  ASSERT_TRUE(P::IsPointInsideBV(c, o + d * 4e5));
  EXPECT_TRUE(P::IsRayIntersectingBV(c, o, d));
}

TEST(RKMPolyBoundingCylinder, DirectionRule)
{
  auto normalized = [](RKMMathVector v) {
    RKMPolyBoundingCylinder::NormalizeDirection(v);
    return v;
  };
  EXPECT_EQ(normalized(RKMMathVector(0, 0, 0)), RKMMathVector(1, 0, 0));
  EXPECT_EQ(normalized(RKMMathVector(0, 0, 2)), RKMMathVector(0, 0, 1));
  EXPECT_EQ(normalized(RKMMathVector(1e200, 0, 0)), RKMMathVector(1, 0, 0));
  EXPECT_EQ(normalized(RKMMathVector(0, 1e-170, 0)), RKMMathVector(0, 1, 0));
  EXPECT_EQ(normalized(RKMMathVector(0, -3e-320, 0)), RKMMathVector(0, -1, 0));
  const RKMMathVector big = normalized(RKMMathVector(3e200, -4e200, 0));
  EXPECT_NEAR(big.x, 0.6, 1e-15);
  EXPECT_NEAR(big.y, -0.8, 1e-15);
  EXPECT_TRUE(std::isnan(normalized(RKMMathVector(kNaN, 1, 0)).x));
  // A vector whose squared length rounds to exactly 1 is kept bit for bit.
  const RKMMathVector unitish(0.6, 0.8, 0);
  if (unitish.SquareNorm() == 1.0)
  {
    EXPECT_EQ(normalized(unitish), unitish);
  }
  Rng g(34);
  for (int n = 0; n < 200; ++n)
  {
    const RKMMathVector u = RandomUnit(g), v = normalized(u * std::pow(10.0, Uniform(g, -250, 250)));
    EXPECT_NEAR(v.Norm(), 1.0, 1e-15);
    EXPECT_LT((v - u).Norm(), 1e-14);
  }

  EXPECT_EQ(RKMPolyBoundingCylinder(RKMMathPoint(), RKMMathVector(), 1, 1).GetDirection(), RKMMathVector(1, 0, 0));
  RKMPolyBoundingCylinder c(RKMMathPoint(), RKMMathVector(0, 3, 0), 1.0, 2.0);
  EXPECT_EQ(c.GetDirection(), RKMMathVector(0, 1, 0));
  c.Set(RKMMathPoint(1, 1, 1), RKMMathVector(0, 0, -5), 0.5, 0.0);
  EXPECT_EQ(c.GetLimit(), 2.0);
  EXPECT_EQ(c.GetDirection(), RKMMathVector(0, 0, -1));
  c.Set(RKMMathPoint(), RKMMathVector(1, 0, 0), 0.5, -3.0);
  EXPECT_EQ(c.GetLimit(), 2.0);
  c.Set(RKMMathPoint(), RKMMathVector(1, 0, 0), 0.5, 4.0);
  EXPECT_EQ(c.GetHalfHeight(), 4.0);
  EXPECT_TRUE(RKMPolyBoundingCylinder(RKMMathPoint(), RKMMathVector(1, 0, 0), 1, -1).IsInfinite());
  EXPECT_TRUE(RKMPolyBoundingCylinder().IsInfinite());
}

TEST(RKMPolyBoundingPlane, ThicknessEquationAndDistance)
{
  RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 4), RKMMathPoint(), -1.0);
  EXPECT_EQ(slab.GetNormal(), RKMMathVector(0, 0, 1));
  EXPECT_EQ(slab.GetThickness(), 1.0);
  EXPECT_DOUBLE_EQ(slab.DistanceTo(RKMMathPoint(5, 5, 3)), 2.0);
  EXPECT_DOUBLE_EQ(slab.SquareDistanceTo(RKMMathPoint(5, 5, 3)), 4.0);
  EXPECT_DOUBLE_EQ(slab.DistanceTo(RKMMathPoint(5, 5, -3)), 2.0);
  EXPECT_EQ(slab.DistanceTo(RKMMathPoint(9, -9, 0.5)), 0.0);
  slab.SetThickness(-2.5);
  EXPECT_EQ(slab.GetThickness(), 2.5);
  slab.Inflate(0.5);
  EXPECT_EQ(slab.GetThickness(), 3.0);
  slab.Inflate(-10);
  EXPECT_EQ(slab.GetThickness(), 0.0);
  slab.SetInfinitelyThick(1);
  EXPECT_EQ(slab.DistanceTo(RKMMathPoint(0, 0, 1e9)), 0.0);

  const RKMPolyBoundingPlane raised(RKMMathVector(0, 0, 1), RKMMathPoint(0, 0, 2), 1.0);
  double a, b, c, d;
  raised.GetEquation(a, b, c, d);
  EXPECT_EQ(a, 0.0);
  EXPECT_EQ(b, 0.0);
  EXPECT_EQ(c, 1.0);
  EXPECT_EQ(d, -2.0);
  const RKMPolyBoundingPlane byDefault;
  EXPECT_EQ(byDefault.GetNormal(), RKMMathVector(0, 0, 1));
  EXPECT_EQ(byDefault.GetThickness(), 0.01);
  EXPECT_FALSE(byDefault.IsInfinitelyThick());
}

// NaN anywhere must not crash nor produce a size that ranks or a negative one.
TEST(RKMPolyBoundingVolume, NaNInputGivesNeutralAnswers)
{
  const RKMMathPoint nanPoint(kNaN, 0, 0);
  const RKMMathVector axes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
  BVPtr volumes[] = {BVPtr(new RKMPolyAABB(RKMMathBox(kNaN, 1, 0, 1, 0, 1))), BVPtr(new RKMPolyBoundingSphere(nanPoint, 1.0)),
                     BVPtr(new RKMPolyOBB(axes, RKMMathVector(1, 1, 1), nanPoint)),
                     BVPtr(new RKMPolyBoundingPlane(RKMMathVector(kNaN, 0, 1), nanPoint, 1.0)),
                     BVPtr(new RKMPolyBoundingCylinder(nanPoint, RKMMathVector(kNaN, 1, 0), 1.0, 1.0)),
                     BVPtr(new RKMPolyBoundingCylinder(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, kNaN))};
  // The float box leaves a NaN side open instead of losing geometry.
  EXPECT_TRUE(P::IsPointInsideBV(*volumes[0], RKMMathPoint(-1e30, 0.5, 0.5)));
  const RKMMathTransformation shift(RKMMathVector(1, 2, 3));
  for (BVPtr &bv : volumes)
  {
    SCOPED_TRACE(bv->GetTypeID());
    EXPECT_FALSE(P::GetRadius(bv.get()) < 0.0);
    EXPECT_FALSE(P::GetVolume(bv.get()) < 0.0);
    P::IsEmpty(bv.get());
    P::GetCenter(bv.get());
    P::IsPointInsideBV(*bv, RKMMathPoint());
    P::IsPointInsideBV(*bv, RKMMathPoint(kNaN, kNaN, kNaN));
    P::IsRayIntersectingBV(*bv, RKMMathPoint(), RKMMathDirection(0, 1, 0));
    P::IsRayIntersectingBV(*bv, RKMMathPoint(kNaN, 0, 0), RKMMathDirection(0, 1, 0));
    RKMMathBox box;
    RKMPolyBVOperations::GetEnclosingBox(*bv, box, &shift);
    RKMPolyBoundingVolume *placed = nullptr;
    EXPECT_EQ(RKMPolyBVOperations::CreateTransformedInstance(*bv, shift, placed), S_OK);
    delete placed;
    RKMPolyBVOperations::Inflate(*bv, kNaN);
    RKMPolyBVOperations::Transform(*bv, RKMMathTransformation(RKMMath3x3Matrix(kNaN, 0, 0, 0, 1, 0, 0, 0, 1), RKMMathVector()));
    delete RKMPolyBVClone::Clone(bv.get());
  }
}
}
