#include "RKMPolyBVTestUtil.h"

#include "RKMPolyBVBVOperations.h"

#include <gtest/gtest.h>

#include <string>

namespace
{
using namespace bvtest;
using BV = RKMPolyBoundingVolume;
using Ops = RKMPolyBVBVOperations;

// Every sampled point of source (within 20 of its origin along unbounded directions) is in target.
void ExpectContains(Rng &g, const BV &target, const BV &source, const char *what)
{
  for (int s = 0; s < 40; ++s)
    ASSERT_TRUE(P::IsPointInsideBV(target, SampleInside(g, source))) << what << " sample " << s << " left out";
}

// Every target kind against every other kind. A bounded target cannot hold an unbounded volume (E_FAIL,
// unchanged); otherwise the result holds both, S_FALSE means unchanged, and absorbing again changes
// nothing. (A slab target may answer S_OK for other kinds than a sphere without changing.)
TEST(RKMPolyBVAbsorb, AbsorbedVolumeIsContained)
{
  int changed = 0, kept = 0;
  for (int kt = 0; kt < kVKindCount; ++kt)
    for (int ko = 0; ko < kVKindCount; ++ko)
    {
      const unsigned seed = 700 + 10 * static_cast<unsigned>(kt) + static_cast<unsigned>(ko);
      Rng g(seed);
      for (int n = 0; n < 40 && !HasFatalFailure(); ++n)
      {
        SCOPED_TRACE(std::string(Name(ko)) + " into " + Name(kt) + ", seed " + std::to_string(seed) + ", case " +
                     std::to_string(n));
        const BVPtr target = RandomVolume(g, kt), other = RandomVolume(g, ko), old = Clone(*target);
        const HRESULT hr = Ops::Absorb(target.get(), other.get());
        const bool exact = kt != kSlab || ko == kSphere;
        if (kt != kSlab && Unbounded(ko))
        {
          EXPECT_TRUE(hr == E_FAIL && Same(*target, *old)) << std::hex << hr;
          continue;
        }
        ASSERT_TRUE(hr == S_OK || hr == S_FALSE) << std::hex << hr;
        (hr == S_OK ? changed : kept)++;
        EXPECT_TRUE(hr == S_FALSE ? Same(*target, *old) : !exact || !Same(*target, *old)) << std::hex << hr;
        ExpectContains(g, *target, *old, "old target");
        ExpectContains(g, *target, *other, "other");
        const BVPtr grown = Clone(*target);
        const HRESULT again = Ops::Absorb(target.get(), other.get());
        EXPECT_TRUE((!exact || again == S_FALSE) && Same(*target, *grown)) << "absorbed again: " << std::hex << again;
      }
    }
  EXPECT_GT(changed, 300);
  EXPECT_GT(kept, 0);
}

TEST(RKMPolyBVAbsorb, SpheresCapsulesAndNullVolumes)
{
  const RKMMathPoint c(1, -2, 3);
  RKMPolyBoundingSphere big(c, 3.0), small(c, 1.0), left({-3, 0, 0}, 1.0);
  const RKMPolyBoundingSphere offCentre({2, -2, 3}, 1.5), right({4, 0, 0}, 2.0), ball({0, 0.1, 0}, 1.0);
  // Held already, concentric or not: unchanged. Holding the target: the target becomes the other, not
  // some ball around both. Disjoint: no larger than the smallest ball around both, plus rounding.
  EXPECT_TRUE(Ops::Absorb(&big, &small) == S_FALSE && Ops::Absorb(&big, &offCentre) == S_FALSE);
  EXPECT_TRUE(big.GetCenter() == c && big.GetRadius() == 3.0);
  EXPECT_EQ(Ops::Absorb(&small, &big), S_OK);
  EXPECT_TRUE(small.GetCenter() == c && small.GetRadius() == 3.0);
  EXPECT_EQ(Ops::Absorb(&left, &right), S_OK);
  EXPECT_NEAR(left.GetRadius(), 5.0, 1e-12);
  EXPECT_NEAR(left.GetCenter().x, 1.0, 1e-12);
  // A capsule of radius 0.1 along x takes in a unit ball centred 0.1 off its axis.
  RKMPolyBoundingCylinder capsule({}, {1, 0, 0}, 0.1, 1.0);
  ASSERT_EQ(Ops::Absorb(&capsule, &ball), S_OK);
  EXPECT_TRUE(P::IsPointInsideBV(capsule, {0, -0.9, 0}));

  EXPECT_EQ(Ops::Absorb(nullptr, &big), E_FAIL);
  Rng g(801);
  for (int k = 0; k < kVKindCount; ++k)
  {
    const BVPtr target = RandomVolume(g, k), old = Clone(*target);
    EXPECT_EQ(Ops::Absorb(target.get(), nullptr), S_FALSE) << Name(k) << ", seed 801";
    EXPECT_TRUE(Same(*target, *old)) << Name(k);
  }
}

// A slab grows along its normal. What crosses every parallel slab (a tilted slab, even by 1e-3, an
// infinite cylinder across it) makes it all space; what it holds changes nothing.
TEST(RKMPolyBVAbsorb, SlabGrowsAlongItsNormalOrBecomesAllSpace)
{
  const RKMPolyBoundingPlane base({0, 0, 1}, {}, 1.0), above({0, 0, -2}, {7, 7, 5}, 1.0);
  RKMPolyBoundingPlane slab(base);
  ASSERT_EQ(Ops::Absorb(&slab, &above), S_OK); // parallel, facing the other way: spans both, finite
  EXPECT_FALSE(slab.IsInfinitelyThick());
  EXPECT_NEAR(slab.GetThickness(), 3.5, 1e-9);
  for (const RKMMathPoint &p : {RKMMathPoint(1e6, -1e6, -1), RKMMathPoint(-1e6, 3e5, 6), RKMMathPoint(0, 0, 2.5)})
    EXPECT_TRUE(P::IsPointInsideBV(slab, p));
  EXPECT_FALSE(P::IsPointInsideBV(slab, {0, 0, 6.01}));

  const RKMPolyBoundingPlane tilted({0, 0.1, 1}, {}, 0.5), nearlyParallel({1e-3, 0, 1}, {}, 1.0);
  const RKMPolyBoundingCylinder acrossLine({}, {0, 1, 1}, 0.5, -1.0), alongLine({0, 0, 3}, {1, 1, 0}, 0.5, -1.0);
  for (const BV *other : BVs{&tilted, &acrossLine, &nearlyParallel})
  {
    slab = base;
    EXPECT_EQ(Ops::Absorb(&slab, other), S_OK);
    EXPECT_TRUE(slab.IsInfinitelyThick() && P::IsPointInsideBV(slab, {1e4, 0, -10}));
    EXPECT_EQ(Ops::Absorb(&slab, &above), S_FALSE);
  }
  // An infinite cylinder lying along the slab only thickens it.
  slab = base;
  EXPECT_EQ(Ops::Absorb(&slab, &alongLine), S_OK);
  EXPECT_TRUE(!slab.IsInfinitelyThick() && P::IsPointInsideBV(slab, {1e5, 1e5, 3.5}));
  const RKMPolyBoundingSphere inside({50, -20, 0.25}, 0.5);
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, -0.5, 0.5));
  for (const BV *held : BVs{&inside, &box})
  {
    slab = base;
    EXPECT_EQ(Ops::Absorb(&slab, held), S_FALSE);
    EXPECT_TRUE(Same(slab, base));
  }
}

// An empty target takes the other. An empty other changes nothing, whatever the target; a cylinder of
// limit 0 reads as infinite, so no bounded target can hold it.
TEST(RKMPolyBVAbsorb, EmptyTargetsEmptyOthersAndZeroLimits)
{
  Rng g(803);
  for (int ko : {kAABB, kSphere, kOBB, kCapsule})
  {
    const BVPtr other = RandomVolume(g, ko);
    RKMPolyAABB box;
    RKMPolyOBB obb;
    for (BV *target : std::initializer_list<BV *>{&box, &obb})
    {
      EXPECT_EQ(Ops::Absorb(target, other.get()), S_OK) << Name(ko) << ", seed 803";
      ExpectContains(g, *target, *other, Name(ko));
    }
    // The box is rounded outward to floats, so it holds its source beyond doubt. (An oriented box that
    // took a copy of another cannot prove to the last bit that it holds it, and may grow again.)
    EXPECT_EQ(Ops::Absorb(&box, other.get()), S_FALSE) << Name(ko);
  }
  const RKMPolyAABB emptyBox;
  const RKMPolyBoundingSphere negative({9, 9, 9}, -1.0);
  const RKMPolyOBB undefined;
  const RKMPolyBoundingCylinder emptyCapsule({9, 9, 9}, {1, 0, 0}, -1.0, 3.0), zeroLimit({}, {1, 0, 0}, 0.5, 0.0);
  Rng h(804);
  for (int k = 0; k < kVKindCount; ++k)
    for (const BV *other : BVs{&emptyBox, &negative, &undefined, &emptyCapsule, &zeroLimit})
    {
      if (k == kSlab && other == &zeroLimit)
        continue;
      const BVPtr target = RandomVolume(h, k), old = Clone(*target);
      EXPECT_EQ(Ops::Absorb(target.get(), other), other == &zeroLimit ? E_FAIL : S_FALSE)
          << Name(k) << " target, other kind " << other->GetTypeID() << ", seed 804";
      EXPECT_TRUE(Same(*target, *old)) << Name(k) << " target, other kind " << other->GetTypeID();
    }
}

// The volume of the union bounds both volumes; unbounded volumes give 1e40 (slabs) or at least 1e30.
// A capsule first measures the union as a capsule (π·r²·limit), which can fall below a sphere's
// volume, and does not take the others' unbounded answers.
TEST(RKMPolyBVBVUnion, VolumeOfUnionBoundsBoth)
{
  Rng g(805);
  for (int k1 : {kAABB, kSphere, kOBB, kCapsule})
    for (int k2 : {kAABB, kSphere, kOBB, kCapsule})
      for (int n = 0; n < 30; ++n)
      {
        const BVPtr a = RandomVolume(g, k1), b = RandomVolume(g, k2);
        const double both = std::fmax(P::GetVolume(a.get()), P::GetVolume(b.get()));
        EXPECT_TRUE((k1 == kCapsule && k2 == kSphere) || Ops::GetVolumeOfUnion(a.get(), b.get()) >= both * (1 - 1e-9))
            << Name(k1) << " / " << Name(k2) << ", seed 805, case " << n;
      }
  const RKMPolyBoundingPlane slab;
  const RKMPolyBoundingCylinder infinite({}, {1, 0, 0}, 1.0, -1.0), capsule({}, {1, 0, 0}, 0.1, 0.1);
  for (int k = 0; k < kVKindCount; ++k)
  {
    const BVPtr bv = RandomVolume(g, k);
    const double withSlab = Ops::GetVolumeOfUnion(bv.get(), &slab),
                 withInfinite = Ops::GetVolumeOfUnion(bv.get(), &infinite);
    EXPECT_TRUE(Ops::GetVolumeOfUnion(&slab, bv.get()) == 1e40 && Ops::GetVolumeOfUnion(&infinite, bv.get()) >= 1e30);
    EXPECT_TRUE(k == kCapsule || k == kInfiniteCylinder || (withSlab == 1e40 && withInfinite >= 1e30)) << Name(k);
    EXPECT_TRUE(Ops::GetVolumeOfUnion(bv.get(), nullptr) == 0.0 && Ops::GetVolumeOfUnion(nullptr, bv.get()) == 0.0);
  }
  const RKMPolyBoundingSphere ball({}, 2.0);
  EXPECT_GE(Ops::GetVolumeOfUnion(&capsule, &ball), P::GetVolume(&ball));
  EXPECT_TRUE(Ops::GetVolumeOfUnion(&capsule, &slab) == 1e40 && Ops::GetVolumeOfUnion(&infinite, &slab) == 1e40);
  EXPECT_GE(Ops::GetVolumeOfUnion(&capsule, &infinite), 1e30);
}
} // namespace
