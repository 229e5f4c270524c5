#include "RKMPolyBVTestUtil.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>

namespace
{
using namespace bvtest;
using Ops = RKMPolyBVOperations;
using T3 = RKMMathTransformation;

// Every point of the source, mapped by T, lies in the placed volume (made anew and in place) and in the
// box enclosing the placement, which exists for bounded volumes only: a miss here is a missed clash.
void ExpectPlacementEncloses(Rng &g, const RKMPolyBoundingVolume &bv, const T3 &T, int samples)
{
  const BVPtr placed = Placed(bv, &T), inPlace = Clone(bv);
  ASSERT_TRUE(placed && Ops::Transform(*inPlace, T) == S_OK);
  RKMMathBox box, plain;
  const HRESULT hr = Ops::GetEnclosingBox(bv, box, &T), plainHr = Ops::GetEnclosingBox(bv, plain);
  const bool bounded = bv.GetTypeID() != RKMPolyBoundingVolume::TypePlane &&
                       !(bv.GetTypeID() == RKMPolyBoundingVolume::TypeCylinder &&
                         static_cast<const RKMPolyBoundingCylinder &>(bv).GetLimit() <= 0);
  EXPECT_TRUE(hr == plainHr && hr == (bounded ? S_OK : E_FAIL)) << hr;
  for (int s = 0; s < samples; ++s)
  {
    const RKMMathPoint p = SampleInside(g, bv), q = T * p;
    ASSERT_TRUE(P::IsPointInsideBV(bv, p)) << "the sampler left the source";
    ASSERT_TRUE(P::IsPointInsideBV(*placed, q) && P::IsPointInsideBV(*inPlace, q)) << "sample " << s;
    ASSERT_TRUE(hr != S_OK || (box.IsContaining(q) && plain.IsContaining(p))) << "sample " << s;
  }
}

// The four kinds of maps, and a flattening one (a flattened slab is all space).
TEST(RKMPolyBVOperations, PlacementEnclosesTheImage)
{
  const T3 flatten(RKMMath3x3Matrix(1, 2, 0, 0, 1, 0, 1, 3, 0), RKMMathVector(1, -1, 2));
  for (int tk = 0; tk < 5; ++tk)
    for (int k = 0; k < kVKindCount; ++k)
    {
      const unsigned seed = 100 + 10 * static_cast<unsigned>(tk) + static_cast<unsigned>(k);
      Rng g(seed);
      for (int n = 0; n < (tk < 4 ? 60 : 20) && !HasFatalFailure(); ++n)
      {
        SCOPED_TRACE(std::string(Name(k)) + " under " + (tk < 4 ? Name(kAllTKinds[tk]) : "flattening") + ", seed " +
                     std::to_string(seed) + ", volume " + std::to_string(n));
        const BVPtr bv = RandomVolume(g, k);
        ExpectPlacementEncloses(g, *bv, tk < 4 ? RandomTransformation(g, kAllTKinds[tk]) : flatten, tk < 4 ? 40 : 30);
      }
    }
  EXPECT_TRUE((flatten * RKMPolyBoundingPlane({0, 0, 1}, {}, 0.5)).IsInfinitelyThick());
}

// IsSimilitude accepts a relative distortion up to 1e-9. Such a map is no similitude: placing by the
// similitude rule loses part of the image, visibly so for an unbounded slab.
TEST(RKMPolyBVOperations, NearSimilitudeStillEncloses)
{
  const RKMMath3x3Matrix M(1, 9e-10, 0, 0, 1, 0, 0, 0, 1);
  double s = 0;
  ASSERT_TRUE(M.IsSimilitude(s));
  const T3 T(M, RKMMathVector());
  const RKMPolyBoundingPlane slab({1, 0, 0}, {}, 0.01);
  const RKMPolyBoundingSphere ball({}, 1.0);
  const RKMPolyBoundingCylinder capsule({}, {0, 0, 1}, 1.0, 1.0);
  const RKMMathPoint inSlab(0.01 * (1 - 1e-6), 1e3, 0),
      onBall(std::sqrt(0.5) * (1 - 1e-12), std::sqrt(0.5) * (1 - 1e-12), 0);
  ASSERT_TRUE(P::IsPointInsideBV(slab, inSlab) && P::IsPointInsideBV(ball, onBall));
  RKMPolyBoundingSphere placedBall(ball);
  Ops::Transform(placedBall, T);
  EXPECT_TRUE(P::IsPointInsideBV(T * slab, T * inSlab));
  EXPECT_TRUE(P::IsPointInsideBV(placedBall, T * onBall));
  EXPECT_TRUE(P::IsPointInsideBV(*Placed(capsule, &T), T * onBall));
}

TEST(RKMPolyBVOperations, SimilitudesScaleExactly)
{
  RKMPolyBoundingSphere unit({1, 0, 0}, 1.0);
  ASSERT_EQ(Ops::Transform(unit, T3(RKMMath3x3Matrix(2, 0, 0, 0, 2, 0, 0, 0, 2), RKMMathVector())), S_OK);
  EXPECT_DOUBLE_EQ(unit.GetRadius(), 2.0);
  EXPECT_EQ(unit.GetCenter(), RKMMathPoint(2, 0, 0));
  Rng g(151);
  for (int n = 0; n < 100; ++n)
  {
    SCOPED_TRACE("seed 151, case " + std::to_string(n));
    const double scale = Uniform(g, 0.2, 5) * (n % 2 ? -1 : 1), s = std::fabs(scale), eps = 1e-12 * s;
    const T3 T(RandomRotation(g) * RKMMath3x3Matrix(scale, 0, 0, 0, scale, 0, 0, 0, scale),
               RandomPoint(g, 3).AsVector());
    const RKMPolyBoundingCylinder capsule(RandomPoint(g, 3), RandomUnit(g), Uniform(g, 0.1, 2), Uniform(g, 0.1, 2));
    const BVPtr placed = Placed(capsule, &T);
    const auto &c = static_cast<const RKMPolyBoundingCylinder &>(*placed);
    EXPECT_NEAR(c.GetRadius(), capsule.GetRadius() * s, eps);
    EXPECT_NEAR(c.GetLimit(), capsule.GetLimit() * s, eps);
    EXPECT_NEAR(std::fabs(c.GetDirection() * (T * capsule.GetDirection())), s, eps);
    const RKMPolyBoundingPlane slab(RandomUnit(g), RandomPoint(g, 3), Uniform(g, 0.1, 2));
    EXPECT_NEAR((T * slab).GetThickness(), slab.GetThickness() * s, eps);
  }
  // A box stays a box under the identity only; a limit of 0 reads as infinite, and the placed
  // cylinder says so in the usual way.
  const RKMPolyAABB box(RKMMathBox(0, 1, -2, 3, 4, 5));
  const T3 identity, shift(RKMMathVector(0, 0, 1e-3));
  const BVPtr same = Placed(box, &identity), moved = Placed(box, &shift),
              zero = Placed(RKMPolyBoundingCylinder({}, {1, 0, 0}, 1.0, 0.0), &shift);
  ASSERT_EQ(same->GetTypeID(), RKMPolyBoundingVolume::TypeAABB);
  EXPECT_TRUE(static_cast<const RKMPolyAABB &>(*same) == box);
  EXPECT_EQ(moved->GetTypeID(), RKMPolyBoundingVolume::TypeOBB);
  EXPECT_TRUE(static_cast<const RKMPolyBoundingCylinder &>(*zero).IsInfinite());
}

// Only positive amounts grow a volume, and then by at least the amount in every direction.
TEST(RKMPolyBVOperations, InflateGrowsAndOnlyForPositiveAmounts)
{
  Rng g(152);
  for (int k = 0; k < kVKindCount; ++k)
    for (int n = 0; n < 40 && !HasFatalFailure(); ++n)
    {
      SCOPED_TRACE(std::string(Name(k)) + ", seed 152, case " + std::to_string(n));
      const BVPtr bv = RandomVolume(g, k);
      for (double d : {0.0, -0.5, std::numeric_limits<double>::quiet_NaN()})
      {
        const BVPtr same = Clone(*bv);
        EXPECT_EQ(Ops::Inflate(*same, d), S_OK);
        EXPECT_TRUE(P::GetVolume(same.get()) == P::GetVolume(bv.get()) &&
                    P::GetRadius(same.get()) == P::GetRadius(bv.get()))
            << d;
      }
      const double d = Uniform(g, 0.01, 1);
      const BVPtr grown = Clone(*bv);
      ASSERT_EQ(Ops::Inflate(*grown, d), S_OK);
      for (int s = 0; s < 40; ++s)
      {
        const RKMMathPoint p = SampleInside(g, *bv);
        ASSERT_TRUE(P::IsPointInsideBV(*grown, p));
        ASSERT_TRUE(P::IsPointInsideBV(*grown, p + RandomUnit(g) * (d * (1 - 1e-6)))) << "sample " << s;
      }
    }
  // A capsule keeps its limit; a cylinder of limit 0 stays infinite; inflating nothing gives nothing.
  RKMPolyBoundingCylinder capsule({}, {0, 1, 0}, 1.0, 2.0), infinite;
  infinite.Set(RKMMathPoint(), RKMMathVector(0, 1, 0), 1.0, 0.0);
  RKMPolyBoundingSphere negative({}, -1.0);
  RKMPolyOBB undefined;
  RKMPolyAABB emptyBox;
  for (RKMPolyBoundingVolume *bv :
       std::initializer_list<RKMPolyBoundingVolume *>{&capsule, &infinite, &negative, &undefined, &emptyBox})
    Ops::Inflate(*bv, bv == &capsule || bv == &infinite ? 0.5 : 5.0);
  EXPECT_TRUE(capsule.GetRadius() == 1.5 && capsule.GetLimit() == 2.0);
  EXPECT_TRUE(infinite.GetRadius() == 1.5 && infinite.IsInfinite());
  EXPECT_FALSE(P::IsPointInsideBV(negative, RKMMathPoint()) || undefined.IsDefined() || !emptyBox.GetBoxf().IsEmpty());
}

TEST(RKMPolyBVOperations, EnclosingBoxEdgeCases)
{
  // A capsule's box is tight to a few ulps, and the same without a placement.
  const RKMPolyBoundingCylinder capsule({}, {1, 0, 0}, 1.0, 2.0);
  RKMMathBox box, viaNull;
  ASSERT_EQ(Ops::GetEnclosingBox(capsule, box), S_OK);
  const double expectedLow[3] = {-3, -1, -1}, expectedHigh[3] = {3, 1, 1},
               ulps = 24 * std::numeric_limits<double>::epsilon();
  for (int i = 0; i < 3; ++i)
  {
    const double lo = box.GetLow()[i], hi = box.GetHigh()[i];
    EXPECT_TRUE(lo <= expectedLow[i] && lo >= expectedLow[i] - ulps && hi >= expectedHigh[i] &&
                hi <= expectedHigh[i] + ulps)
        << i;
  }
  EXPECT_EQ(Ops::GetEnclosingBox(capsule, viaNull, nullptr), S_OK);
  EXPECT_EQ(viaNull, box);
  // Unbounded volumes (a limit of 0 reads as infinite) have no box and leave the output alone; an
  // unknown kind is refused by every operation but Inflate.
  const RKMMathBox sentinel(7, 8, 7, 8, 7, 8);
  const RKMPolyBoundingPlane slab;
  const RKMPolyBoundingCylinder infinite({}, {1, 0, 0}, 1.0, -1.0), zero({}, {1, 0, 0}, 1.0, 0.0);
  UnknownBV unknown;
  const T3 shift(RKMMathVector(1, 0, 0));
  for (const RKMPolyBoundingVolume *bv : BVs{&slab, &infinite, &zero, &unknown})
  {
    RKMMathBox b = sentinel;
    const HRESULT expected = bv == &unknown ? E_NOTIMPL : E_FAIL;
    EXPECT_TRUE(Ops::GetEnclosingBox(*bv, b) == expected && Ops::GetEnclosingBox(*bv, b, &shift) == expected &&
                Ops::GetEnclosingBox(*bv, b, nullptr) == expected && b == sentinel)
        << bv->GetTypeID();
  }
  RKMPolyBoundingVolume *untouched = &unknown;
  EXPECT_EQ(Ops::CreateTransformedInstance(unknown, T3(), untouched), E_NOTIMPL);
  EXPECT_EQ(untouched, &unknown);
  EXPECT_EQ(Ops::Transform(unknown, T3()), E_NOTIMPL);
  EXPECT_EQ(Ops::Inflate(unknown, 1.0), S_OK);

  const RKMPolyAABB aabb(RKMMathBox(0, 1, 0, 2, 0, 4));
  ASSERT_EQ(Ops::GetEnclosingBox(aabb, box), S_OK);
  EXPECT_EQ(box, aabb.GetBoxf().GetMathBox());
  const RKMPolyBoundingSphere sphere({0.1, 0.2, 0.3}, 0.7);
  ASSERT_EQ(Ops::GetEnclosingBox(sphere, box), S_OK);
  EXPECT_TRUE(box.IsContaining({0.8, 0.2, 0.3}) && box.IsContaining({0.1, -0.5, 1.0}));
  EXPECT_LT(box.Volume(), 1.4 * 1.4 * 1.4 * (1 + 1e-12));
}
} // namespace
