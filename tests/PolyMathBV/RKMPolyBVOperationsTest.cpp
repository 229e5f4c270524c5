#include "RKMPolyBVTestUtil.h"

#include "RKMPolyBVClone.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBVProperties.h"

#include "RKMMathBox.h"

#include <gtest/gtest.h>

#include <cmath>
#include <initializer_list>
#include <limits>
#include <string>

namespace
{
using namespace bvtest;
using P = RKMPolyBVProperties;
using Ops = RKMPolyBVOperations;

bool Bounded(const RKMPolyBoundingVolume &bv)
{
  return bv.GetTypeID() != RKMPolyBoundingVolume::TypePlane &&
         !(bv.GetTypeID() == RKMPolyBoundingVolume::TypeCylinder && static_cast<const RKMPolyBoundingCylinder &>(bv).GetLimit() <= 0);
}

// Every point of the source, mapped by T, must lie in the placed volume (made new and in place) and
// in the box enclosing the placement: a miss here is a missed clash.
void ExpectPlacementEncloses(Rng &g, const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T, int samples)
{
  RKMPolyBoundingVolume *raw = nullptr;
  ASSERT_EQ(Ops::CreateTransformedInstance(bv, T, raw), S_OK);
  const BVPtr placed(raw);
  ASSERT_NE(placed, nullptr);
  const BVPtr inPlace(RKMPolyBVClone::Clone(&bv));
  ASSERT_EQ(Ops::Transform(*inPlace, T), S_OK);
  RKMMathBox box, plain;
  const HRESULT hr = Ops::GetEnclosingBox(bv, box, &T), plainHr = Ops::GetEnclosingBox(bv, plain);
  EXPECT_EQ(hr, Bounded(bv) ? S_OK : E_FAIL);
  EXPECT_EQ(plainHr, Bounded(bv) ? S_OK : E_FAIL);
  for (int s = 0; s < samples; ++s)
  {
    const RKMMathPoint p = SampleInside(g, bv);
    ASSERT_TRUE(P::IsPointInsideBV(bv, p)) << "the sampler left the source";
    const RKMMathPoint q = T * p;
    ASSERT_TRUE(P::IsPointInsideBV(*placed, q)) << "sample " << s;
    ASSERT_TRUE(P::IsPointInsideBV(*inPlace, q)) << "sample " << s;
    ASSERT_TRUE(hr != S_OK || box.IsContaining(q)) << "sample " << s;
    ASSERT_TRUE(plainHr != S_OK || plain.IsContaining(p)) << "sample " << s;
  }
}

TEST(RKMPolyBVOperations, PlacementEnclosesTheImage)
{
  for (TKind tk : kAllTKinds)
    for (int k = 0; k < kVKindCount; ++k)
    {
      const unsigned seed = 100 + 10 * static_cast<unsigned>(tk) + static_cast<unsigned>(k);
      Rng g(seed);
      SCOPED_TRACE(std::string(Name(k)) + " under " + Name(tk) + ", seed " + std::to_string(seed));
      for (int n = 0; n < 60; ++n)
      {
        SCOPED_TRACE("volume " + std::to_string(n));
        const BVPtr bv = RandomVolume(g, k);
        const RKMMathTransformation T = RandomTransformation(g, tk);
        ExpectPlacementEncloses(g, *bv, T, 40);
        if (HasFatalFailure())
          return;
      }
    }
}

TEST(RKMPolyBVOperations, FlatteningTransformationsStillEnclose)
{
  Rng g(150);
  SCOPED_TRACE("seed 150");
  const RKMMathTransformation flatten(RKMMath3x3Matrix(1, 2, 0, 0, 1, 0, 1, 3, 0), RKMMathVector(1, -1, 2));
  for (int k = 0; k < kVKindCount; ++k)
  {
    SCOPED_TRACE(Name(k));
    for (int n = 0; n < 20; ++n)
      ExpectPlacementEncloses(g, *RandomVolume(g, k), flatten, 30);
  }
  const RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 1), RKMMathPoint(), 0.5);
  EXPECT_TRUE((flatten * slab).IsInfinitelyThick());
}

// IsSimilitude accepts a relative distortion up to 1e-9. Such a map is no similitude: placing by the
// similitude rule loses part of the image, visibly so for an unbounded slab.
TEST(RKMPolyBVOperations, NearSimilitudeStillEncloses)
{
  const RKMMath3x3Matrix M(1, 9e-10, 0, 0, 1, 0, 0, 0, 1);
  double s = 0;
  ASSERT_TRUE(M.IsSimilitude(s));
  const RKMMathTransformation T(M, RKMMathVector());
  const RKMPolyBoundingPlane slab(RKMMathVector(1, 0, 0), RKMMathPoint(), 0.01);
  const RKMMathPoint inSlab(0.01 * (1 - 1e-6), 1e3, 0);
  ASSERT_TRUE(P::IsPointInsideBV(slab, inSlab));
  const RKMPolyBoundingSphere ball(RKMMathPoint(), 1.0);
  const RKMMathPoint onBall(std::sqrt(0.5) * (1 - 1e-12), std::sqrt(0.5) * (1 - 1e-12), 0);
  ASSERT_TRUE(P::IsPointInsideBV(ball, onBall));
  const bool slabHolds = P::IsPointInsideBV(T * slab, T * inSlab);
  RKMPolyBoundingSphere placedBall(ball);
  Ops::Transform(placedBall, T);
  const bool ballHolds = P::IsPointInsideBV(placedBall, T * onBall);
  const RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(0, 0, 1), 1.0, 1.0);
  RKMPolyBoundingVolume *raw = nullptr;
  ASSERT_EQ(Ops::CreateTransformedInstance(capsule, T, raw), S_OK);
  const bool capsuleHolds = P::IsPointInsideBV(*BVPtr(raw), T * onBall);
  EXPECT_TRUE(slabHolds);
  EXPECT_TRUE(ballHolds);
  EXPECT_TRUE(capsuleHolds);
}

TEST(RKMPolyBVOperations, SimilitudesScaleExactly)
{
  RKMPolyBoundingSphere unit(RKMMathPoint(1, 0, 0), 1.0);
  ASSERT_EQ(Ops::Transform(unit, RKMMathTransformation(RKMMath3x3Matrix(2, 0, 0, 0, 2, 0, 0, 0, 2), RKMMathVector())), S_OK);
  EXPECT_DOUBLE_EQ(unit.GetRadius(), 2.0);
  EXPECT_EQ(unit.GetCenter(), RKMMathPoint(2, 0, 0));

  Rng g(151);
  SCOPED_TRACE("seed 151");
  for (int n = 0; n < 100; ++n)
  {
    const double scale = Uniform(g, 0.2, 5) * (n % 2 ? -1 : 1);
    const RKMMathTransformation T(RandomRotation(g) * RKMMath3x3Matrix(scale, 0, 0, 0, scale, 0, 0, 0, scale), RandomPoint(g, 3).AsVector());
    const RKMPolyBoundingCylinder capsule(RandomPoint(g, 3), RandomUnit(g), Uniform(g, 0.1, 2), Uniform(g, 0.1, 2));
    RKMPolyBoundingVolume *raw = nullptr;
    ASSERT_EQ(Ops::CreateTransformedInstance(capsule, T, raw), S_OK);
    const BVPtr placed(raw);
    const auto &c = static_cast<const RKMPolyBoundingCylinder &>(*placed);
    EXPECT_NEAR(c.GetRadius(), capsule.GetRadius() * std::fabs(scale), 1e-12 * std::fabs(scale));
    EXPECT_NEAR(c.GetLimit(), capsule.GetLimit() * std::fabs(scale), 1e-12 * std::fabs(scale));
    EXPECT_NEAR(std::fabs(c.GetDirection() * (T * capsule.GetDirection())), std::fabs(scale), 1e-12 * std::fabs(scale));
    const RKMPolyBoundingPlane slab(RandomUnit(g), RandomPoint(g, 3), Uniform(g, 0.1, 2));
    EXPECT_NEAR((T * slab).GetThickness(), slab.GetThickness() * std::fabs(scale), 1e-12 * std::fabs(scale));
  }

  const RKMPolyAABB box(RKMMathBox(0, 1, -2, 3, 4, 5));
  RKMPolyBoundingVolume *raw = nullptr;
  ASSERT_EQ(Ops::CreateTransformedInstance(box, RKMMathTransformation(), raw), S_OK);
  BVPtr same(raw);
  ASSERT_EQ(same->GetTypeID(), RKMPolyBoundingVolume::TypeAABB);
  EXPECT_TRUE(static_cast<const RKMPolyAABB &>(*same) == box);
  ASSERT_EQ(Ops::CreateTransformedInstance(box, RKMMathTransformation(RKMMathVector(0, 0, 1e-3)), raw), S_OK);
  same.reset(raw);
  EXPECT_EQ(same->GetTypeID(), RKMPolyBoundingVolume::TypeOBB);

  // A limit of 0 reads as infinite; the placed cylinder must say so in the usual way.
  const RKMPolyBoundingCylinder zero(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 0.0);
  ASSERT_EQ(Ops::CreateTransformedInstance(zero, RKMMathTransformation(RKMMathVector(1, 1, 1)), raw), S_OK);
  same.reset(raw);
  EXPECT_TRUE(static_cast<const RKMPolyBoundingCylinder &>(*same).IsInfinite());
}

TEST(RKMPolyBVOperations, InflateGrowsAndOnlyForPositiveAmounts)
{
  Rng g(152);
  SCOPED_TRACE("seed 152");
  for (int k = 0; k < kVKindCount; ++k)
  {
    SCOPED_TRACE(Name(k));
    for (int n = 0; n < 40; ++n)
    {
      const BVPtr bv = RandomVolume(g, k);
      for (double d : {0.0, -0.5, std::numeric_limits<double>::quiet_NaN()})
      {
        const BVPtr same(RKMPolyBVClone::Clone(bv.get()));
        EXPECT_EQ(Ops::Inflate(*same, d), S_OK);
        EXPECT_EQ(P::GetVolume(same.get()), P::GetVolume(bv.get())) << d;
        EXPECT_EQ(P::GetRadius(same.get()), P::GetRadius(bv.get())) << d;
      }
      const double d = Uniform(g, 0.01, 1);
      const BVPtr grown(RKMPolyBVClone::Clone(bv.get()));
      ASSERT_EQ(Ops::Inflate(*grown, d), S_OK);
      for (int s = 0; s < 40; ++s)
      {
        const RKMMathPoint p = SampleInside(g, *bv);
        ASSERT_TRUE(P::IsPointInsideBV(*grown, p));
        // Within d of the source is within the grown volume (a little less, for rounding).
        ASSERT_TRUE(P::IsPointInsideBV(*grown, p + RandomUnit(g) * (d * (1 - 1e-6)))) << "sample " << s;
      }
    }
  }
  RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(0, 1, 0), 1.0, 2.0), infinite;
  infinite.Set(RKMMathPoint(), RKMMathVector(0, 1, 0), 1.0, 0.0);
  Ops::Inflate(capsule, 0.5);
  Ops::Inflate(infinite, 0.5);
  EXPECT_EQ(capsule.GetRadius(), 1.5);
  EXPECT_EQ(capsule.GetLimit(), 2.0);
  EXPECT_EQ(infinite.GetRadius(), 1.5);
  EXPECT_TRUE(infinite.IsInfinite());
  // Inflating nothing gives nothing.
  RKMPolyBoundingSphere negative(RKMMathPoint(), -1.0);
  RKMPolyOBB undefined;
  RKMPolyAABB emptyBox;
  Ops::Inflate(negative, 5);
  Ops::Inflate(undefined, 5);
  Ops::Inflate(emptyBox, 5);
  EXPECT_FALSE(P::IsPointInsideBV(negative, RKMMathPoint()));
  EXPECT_FALSE(undefined.IsDefined());
  EXPECT_TRUE(emptyBox.GetBoxf().IsEmpty());
}

TEST(RKMPolyBVOperations, EnclosingBoxEdgeCases)
{
  const RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 2.0);
  RKMMathBox box;
  ASSERT_EQ(Ops::GetEnclosingBox(capsule, box), S_OK);
  const double expectedLow[3] = {-3, -1, -1}, expectedHigh[3] = {3, 1, 1};
  for (int i = 0; i < 3; ++i)
  {
    const double lo = box.GetLow()[i], hi = box.GetHigh()[i];
    EXPECT_LE(lo, expectedLow[i]);
    EXPECT_GE(lo, expectedLow[i] - 8 * std::numeric_limits<double>::epsilon() * 3);
    EXPECT_GE(hi, expectedHigh[i]);
    EXPECT_LE(hi, expectedHigh[i] + 8 * std::numeric_limits<double>::epsilon() * 3);
  }
  RKMMathBox viaNull;
  EXPECT_EQ(Ops::GetEnclosingBox(capsule, viaNull, nullptr), S_OK);
  EXPECT_EQ(viaNull, box);

  const RKMMathBox sentinel(7, 8, 7, 8, 7, 8);
  const RKMPolyBoundingPlane slab;
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, -1.0);
  const RKMMathTransformation shift(RKMMathVector(1, 0, 0));
  for (const RKMPolyBoundingVolume *bv : std::initializer_list<const RKMPolyBoundingVolume *>{&slab, &infinite})
  {
    RKMMathBox b = sentinel;
    EXPECT_EQ(Ops::GetEnclosingBox(*bv, b), E_FAIL);
    EXPECT_EQ(Ops::GetEnclosingBox(*bv, b, &shift), E_FAIL);
    EXPECT_EQ(Ops::GetEnclosingBox(*bv, b, nullptr), E_FAIL);
    EXPECT_EQ(b, sentinel);
  }

  const RKMPolyAABB aabb(RKMMathBox(0, 1, 0, 2, 0, 4));
  ASSERT_EQ(Ops::GetEnclosingBox(aabb, box), S_OK);
  EXPECT_EQ(box, aabb.GetBoxf().GetMathBox());
  const RKMPolyBoundingSphere sphere(RKMMathPoint(0.1, 0.2, 0.3), 0.7);
  ASSERT_EQ(Ops::GetEnclosingBox(sphere, box), S_OK);
  EXPECT_TRUE(box.IsContaining(RKMMathPoint(0.8, 0.2, 0.3)));
  EXPECT_TRUE(box.IsContaining(RKMMathPoint(0.1, -0.5, 1.0)));
  EXPECT_LT(box.Volume(), 1.4 * 1.4 * 1.4 * (1 + 1e-12));
}

// A limit of 0 reads as infinite for containment (and after placement), so the plain enclosing box
// cannot be finite.
TEST(RKMPolyBVOperations, ZeroLimitCylinderHasNoFiniteBox)
{
  const RKMPolyBoundingCylinder zero(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 0.0);
  RKMMathBox box;
  const HRESULT hr = Ops::GetEnclosingBox(zero, box);
  EXPECT_EQ(hr, E_FAIL);
}

TEST(RKMPolyBVOperations, UnknownKindIsRefused)
{
  class UnknownBV : public RKMPolyBoundingVolume
  {
  public:
    HRESULT Accept(RKMPolyBVConstVisitor &) const override { return E_NOTIMPL; }
    TypeID GetTypeID() const override { return static_cast<TypeID>(7); }
  } unknown;
  RKMPolyBoundingVolume *untouched = &unknown;
  EXPECT_EQ(Ops::CreateTransformedInstance(unknown, RKMMathTransformation(), untouched), E_NOTIMPL);
  EXPECT_EQ(untouched, &unknown);
  EXPECT_EQ(Ops::Transform(unknown, RKMMathTransformation()), E_NOTIMPL);
  EXPECT_EQ(Ops::Inflate(unknown, 1.0), S_OK);
  RKMMathBox box(7, 8, 7, 8, 7, 8);
  const RKMMathTransformation T;
  EXPECT_EQ(Ops::GetEnclosingBox(unknown, box), E_NOTIMPL);
  EXPECT_EQ(Ops::GetEnclosingBox(unknown, box, &T), E_NOTIMPL);
  EXPECT_EQ(box, RKMMathBox(7, 8, 7, 8, 7, 8));
}
}
