#include "RKMPolyBVTestUtil.h"

#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBVProperties.h"

#include "RKMMathBox.h"

#include <gtest/gtest.h>

#include <cmath>
#include <initializer_list>
#include <string>
#include <vector>

namespace
{
using namespace bvtest;
using BV = RKMPolyBoundingVolume;
using Ops = RKMPolyBVBVOperations;
using P = RKMPolyBVProperties;
using T3 = RKMMathTransformation;

class UnknownVolume : public RKMPolyBoundingVolume
{
public:
  HRESULT Accept(RKMPolyBVConstVisitor &) const override { return E_NOTIMPL; }
  TypeID GetTypeID() const override { return static_cast<TypeID>(7); }
};

// The volume as the pair operations see it: placed by T (a clone for no placement).
BVPtr Placed(const BV &bv, const T3 *T)
{
  if (!T)
    return BVPtr(RKMPolyBVClone::Clone(&bv));
  BV *raw = nullptr;
  EXPECT_EQ(RKMPolyBVOperations::CreateTransformedInstance(bv, *T, raw), S_OK);
  return BVPtr(raw);
}

bool Unbounded(int kind) { return kind == kSlab || kind == kInfiniteCylinder; }

const RKMPolyBoundingSphere kUnitAt0(RKMMathPoint(), 1.0);

TEST(RKMPolyBVBVOverlap, TouchingCountsAndToleranceBridgesTheGap)
{
  const RKMPolyBoundingSphere at2(RKMMathPoint(2, 0, 0), 1.0), past(RKMMathPoint(2.0001, 0, 0), 1.0);
  EXPECT_TRUE(Ops::BVOverLap(&kUnitAt0, &at2, 0.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverLap(&kUnitAt0, &past, 0.0, nullptr, nullptr));
  EXPECT_TRUE(Ops::BVOverLap(&kUnitAt0, &past, 0.001, nullptr, nullptr));
  // The same through placements rather than stored centres.
  const T3 by2(RKMMathVector(2, 0, 0)), byPast(RKMMathVector(2.0001, 0, 0));
  EXPECT_TRUE(Ops::BVOverLap(&kUnitAt0, &kUnitAt0, 0.0, nullptr, &by2));
  EXPECT_FALSE(Ops::BVOverLap(&kUnitAt0, &kUnitAt0, 0.0, &byPast, nullptr));
  EXPECT_TRUE(Ops::BVOverLapOnePos(&kUnitAt0, &kUnitAt0, RKMMathVector(0, -2, 0), 0.0));

  const RKMPolyBoundingPlane low(RKMMathVector(0, 0, 1), RKMMathPoint(), 1.0);
  const RKMPolyBoundingPlane touching(RKMMathVector(0, 0, 1), RKMMathPoint(0, 0, 2), 1.0);
  const RKMPolyBoundingPlane apart(RKMMathVector(0, 0, -1), RKMMathPoint(0, 0, 2.0001), 1.0);
  EXPECT_TRUE(Ops::BVOverLap(&low, &touching, 0.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverLap(&low, &apart, 0.0, nullptr, nullptr));
  EXPECT_TRUE(Ops::BVOverLap(&low, &apart, 0.001, nullptr, nullptr));
  // Slabs that are not parallel always cross.
  const RKMPolyBoundingPlane tilted(RKMMathVector(0, 1e-3, 1), RKMMathPoint(0, 0, 50), 0.1);
  EXPECT_TRUE(Ops::BVOverLap(&low, &tilted, 0.0, nullptr, nullptr));

  const RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 2.0);
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 0.0);
  const RKMPolyBoundingSphere near(RKMMathPoint(3.9, 0, 0), 1.0), far(RKMMathPoint(4.1, 0, 0), 1.0);
  EXPECT_TRUE(Ops::BVOverLap(&capsule, &near, 0.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverLap(&capsule, &far, 0.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverLap(&far, &capsule, 0.0, nullptr, nullptr));
  EXPECT_TRUE(Ops::BVOverLap(&infinite, &near, 0.0, nullptr, nullptr));
  EXPECT_TRUE(Ops::BVOverLap(&far, &infinite, 0.0, nullptr, nullptr));
  const RKMPolyBoundingSphere farAway(RKMMathPoint(1e6, 0, 0), 1.0);
  EXPECT_TRUE(Ops::BVOverLap(&infinite, &farAway, 0.0, nullptr, nullptr));
}

TEST(RKMPolyBVBVOverlap, EmptyNullAndUnknownVolumes)
{
  RKMPolyBoundingPlane allSpace;
  allSpace.SetInfinitelyThick(1);
  const RKMPolyBoundingSphere negative(RKMMathPoint(), -1.0);
  const RKMPolyOBB undefined;
  const RKMPolyAABB emptyBox;
  const RKMPolyBoundingCylinder emptyCapsule(RKMMathPoint(), RKMMathVector(1, 0, 0), -1.0, 2.0);
  const RKMPolyAABB box(RKMMathBox(-5, 5, -5, 5, -5, 5));
  const RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 1), RKMMathPoint(), 10.0);
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(), RKMMathVector(1, 0, 0), 10.0, -1.0);
  const T3 shift(RKMMathVector(0.5, 0, 0));
  const std::initializer_list<const BV *> empties = {&negative, &undefined, &emptyBox, &emptyCapsule};
  const std::initializer_list<const BV *> others = {&kUnitAt0, &box, &slab, &infinite, &negative, &undefined};
  for (const BV *e : empties)
    for (const BV *o : others)
    {
      SCOPED_TRACE("empty kind " + std::to_string(e->GetTypeID()) + ", other kind " + std::to_string(o->GetTypeID()));
      EXPECT_FALSE(Ops::BVOverLap(e, o, 0.0, nullptr, nullptr));
      EXPECT_FALSE(Ops::BVOverLap(o, e, 0.5, &shift, nullptr));
      EXPECT_FALSE(Ops::BVOverlapNoPos(e, o, 0.0));
      EXPECT_FALSE(Ops::BVOverLapOnePos(o, e, RKMMathVector(), 0.0));
      EXPECT_EQ(Ops::GetMinimumDistance(e, o, 0.0, nullptr, nullptr), -1.0);
      EXPECT_EQ(Ops::GetSquareMaximumDistance(o, e, 0.0, nullptr, nullptr), -1.0);
      double out = 7.0;
      EXPECT_FALSE(Ops::GetSquareMinDirDistance(e, o, RKMMathVector(1, 0, 0), out, 0.0, nullptr, nullptr));
      EXPECT_EQ(out, 7.0);
    }
  // All of space meets even an empty volume, but the one-placement form refuses empty volumes.
  for (const BV *e : empties)
  {
    EXPECT_TRUE(Ops::BVOverLap(&allSpace, e, 0.0, nullptr, nullptr));
    EXPECT_TRUE(Ops::BVOverLap(e, &allSpace, 0.0, &shift, &shift));
    EXPECT_FALSE(Ops::BVOverLapOnePos(&allSpace, e, 0.0, &shift));
  }
  const RKMPolyBoundingSphere farAway(RKMMathPoint(1e9, -1e9, 3), 0.1);
  EXPECT_TRUE(Ops::BVOverLap(&farAway, &allSpace, 0.0, nullptr, &shift));
  EXPECT_EQ(Ops::GetMinimumDistance(&allSpace, &farAway, 0.0, nullptr, nullptr), 0.0);

  // A tolerance can empty the volume it enlarges.
  EXPECT_FALSE(Ops::BVOverLap(&kUnitAt0, &kUnitAt0, -3.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverlapNoPos(&kUnitAt0, &kUnitAt0, -3.0));

  EXPECT_FALSE(Ops::BVOverLap(nullptr, &box, 0.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverLap(&box, nullptr, 0.0, nullptr, nullptr));
  EXPECT_FALSE(Ops::BVOverLapOnePos(nullptr, &box, 0.0, nullptr));
  EXPECT_FALSE(Ops::BVOverLapOnePos(&box, nullptr, RKMMathVector(), 0.0));
  EXPECT_FALSE(Ops::BVOverlapNoPos(&box, nullptr, 0.0));
  EXPECT_EQ(Ops::GetMinimumDistance(nullptr, &box, 0.0, nullptr, nullptr), -1.0);
  EXPECT_EQ(Ops::GetSquareMinimumDistance(&box, nullptr, 0.0, nullptr, nullptr), -1.0);
  EXPECT_EQ(Ops::GetMaximumDistance(nullptr, &box, 0.0, nullptr, nullptr), -1.0);
  EXPECT_EQ(Ops::GetSquareMaximumDistance(&box, nullptr, 0.0, nullptr, nullptr), -1.0);

  // Nothing is known about an unknown kind, so its overlap cannot be ruled out.
  const UnknownVolume unknown;
  const RKMPolyBoundingSphere distant(RKMMathPoint(1e6, 0, 0), 1.0);
  EXPECT_TRUE(Ops::BVOverLap(&unknown, &distant, 0.0, nullptr, nullptr));
  EXPECT_TRUE(Ops::BVOverLap(&distant, &unknown, 0.0, nullptr, &shift));
  EXPECT_TRUE(Ops::BVOverlapNoPos(&unknown, &unknown, 0.0));
  EXPECT_EQ(Ops::GetMinimumDistance(&unknown, &distant, 0.0, nullptr, nullptr), -1.0);
  EXPECT_EQ(Ops::GetSquareMinimumDistance(&distant, &unknown, 0.0, nullptr, nullptr), -1.0);
  EXPECT_EQ(Ops::GetMaximumDistance(&distant, &unknown, 0.0, nullptr, nullptr), -1.0);
  EXPECT_EQ(Ops::GetSquareMaximumDistance(&unknown, &distant, 0.0, nullptr, nullptr), -1.0);
}

// A sphere (or a short capsule) just off the corner of a unit box along (1, 1, 1): the round volume
// grown by the tolerance stays clear, the box grown by the same tolerance reaches it. So the answer
// tells which of the two took the tolerance, and it must be the lower-ranked one in either order.
TEST(RKMPolyBVBVOverlap, ToleranceEnlargesTheOwningKind)
{
  const double a = 0.45, tol = 0.5;
  const RKMMathPoint offCorner(1 + a, 1 + a, 1 + a);
  const RKMPolyAABB aabb(RKMMathBox(0, 1, 0, 1, 0, 1));
  const RKMMathVector axes[3] = {RKMMathVector(1, 0, 0), RKMMathVector(0, 1, 0), RKMMathVector(0, 0, 1)};
  const RKMPolyOBB obb(axes, RKMMathVector(0.5, 0.5, 0.5), RKMMathPoint(0.5, 0.5, 0.5));
  const RKMPolyBoundingSphere ball(offCorner, 0.1);
  const RKMPolyBoundingCylinder capsule(offCorner, RKMMathVector(1, -1, 0), 0.1, 1e-3);
  // A slab across the diagonal, 0.1 thick, at the same gap as the round volumes.
  const RKMPolyBoundingPlane slab(
      RKMMathVector(1, 1, 1), RKMMathPoint(1 + a, 1 + a, 1 + a) + RKMMathVector(1, 1, 1) * (0.1 / std::sqrt(3.0)), 0.1);
  const T3 slide(RKMMathVector(-0.5, 0.25, 0.25));
  for (const BV *round : std::initializer_list<const BV *>{&ball, &capsule, &slab})
    for (const BV *box : std::initializer_list<const BV *>{&aabb, &obb})
    {
      SCOPED_TRACE("owner kind " + std::to_string(round->GetTypeID()) + ", box kind " +
                   std::to_string(box->GetTypeID()));
      EXPECT_FALSE(Ops::BVOverLap(round, box, tol, nullptr, nullptr));
      EXPECT_FALSE(Ops::BVOverLap(box, round, tol, nullptr, nullptr));
      EXPECT_FALSE(Ops::BVOverLap(box, round, tol, &slide, &slide));
      EXPECT_FALSE(Ops::BVOverLapOnePos(box, round, tol, nullptr));
      EXPECT_FALSE(Ops::BVOverlapNoPos(box, round, tol));
      EXPECT_GT(Ops::GetMinimumDistance(box, round, tol, nullptr, nullptr), 0.0);
      EXPECT_EQ(Ops::GetMinimumDistance(box, round, tol, &slide, &slide),
                Ops::GetMinimumDistance(round, box, tol, &slide, &slide));
      // A larger tolerance on the owner does bridge the gap.
      EXPECT_TRUE(Ops::BVOverLap(box, round, 0.8, nullptr, nullptr));
    }
}

// The three forms with fewer placements are the general form with the missing ones as identity.
TEST(RKMPolyBVBVOverlap, ShorterFormsAgreeWithTheGeneralOne)
{
  Rng g(401);
  SCOPED_TRACE("seed 401");
  for (int n = 0; n < 300; ++n)
  {
    const int k1 = n % kVKindCount, k2 = (n / kVKindCount) % kVKindCount;
    const BVPtr a = RandomVolume(g, k1), b = RandomVolume(g, k2);
    const T3 T = RandomTransformation(g, kAllTKinds[n % 4]);
    const RKMMathVector v = RandomPoint(g, 4).AsVector();
    const T3 byV(v);
    const double tol = n % 3 ? 0.0 : Uniform(g, 0, 0.3);
    SCOPED_TRACE(std::string(Name(k1)) + " / " + Name(k2) + ", case " + std::to_string(n));
    EXPECT_EQ(Ops::BVOverLapOnePos(a.get(), b.get(), tol, &T), Ops::BVOverLap(a.get(), b.get(), tol, nullptr, &T));
    EXPECT_EQ(Ops::BVOverLapOnePos(a.get(), b.get(), v, tol), Ops::BVOverLap(a.get(), b.get(), tol, nullptr, &byV));
    EXPECT_EQ(Ops::BVOverlapNoPos(a.get(), b.get(), tol), Ops::BVOverLap(a.get(), b.get(), tol, nullptr, nullptr));
  }
}

struct PairCase
{
  BVPtr a, b;
  T3 Ta, Tb;
  const T3 *pa = nullptr, *pb = nullptr;
  double tol = 0.0;
  bool built = false;
  RKMMathPoint shared;
};

// Random volumes of the given kinds and placements; half of them are built to share a point: b's
// placement maps one of b's inner points onto the image of one of a's.
PairCase MakePair(Rng &g, int k1, int k2, int n)
{
  PairCase c;
  c.a = RandomVolume(g, k1);
  c.b = RandomVolume(g, k2);
  c.Ta = RandomTransformation(g, kAllTKinds[n % 4]);
  c.Tb = RandomTransformation(g, kAllTKinds[(n / 4) % 4]);
  c.pa = n % 5 == 1 ? nullptr : &c.Ta;
  c.pb = n % 7 == 2 ? nullptr : &c.Tb;
  c.tol = n % 2 ? 0.0 : Uniform(g, 0.0, 0.05);
  if (n % 2 == 0 && c.pb)
  {
    const RKMMathPoint p = SampleInside(g, *c.a, 3.0), q = SampleInside(g, *c.b, 3.0);
    c.shared = c.pa ? c.Ta * p : p;
    c.Tb.SetTranslation(c.shared - RKMMathPoint(c.Tb.GetMatrix() * q.AsVector()));
    c.built = true;
  }
  return c;
}

double Scale(const RKMMathPoint &p, const RKMMathPoint &q)
{
  return 1.0 + std::fabs(p.x) + std::fabs(p.y) + std::fabs(p.z) + std::fabs(q.x) + std::fabs(q.y) + std::fabs(q.z);
}

// For every ordered pair of kinds: a point found in both placed volumes means an overlap; sampled
// point pairs bound the minimum distance from above and the maximum from below (each widened by the
// tolerance, which grows the owner by at least that much in every direction); and a witness pair p, q
// bounds the travel along q − p from above, in both senses of the direction.
TEST(RKMPolyBVBVOverlap, RandomPairsAgainstSampledPoints)
{
  int witnessed = 0, cases = 0;
  for (int k1 = 0; k1 < kVKindCount; ++k1)
    for (int k2 = 0; k2 < kVKindCount; ++k2)
    {
      const unsigned seed = 500 + 10 * static_cast<unsigned>(k1) + static_cast<unsigned>(k2);
      Rng g(seed);
      SCOPED_TRACE(std::string(Name(k1)) + " / " + Name(k2) + ", seed " + std::to_string(seed));
      for (int n = 0; n < 40; ++n)
      {
        SCOPED_TRACE("case " + std::to_string(n));
        PairCase c = MakePair(g, k1, k2, n);
        const BV *a = c.a.get(), *b = c.b.get();
        const BVPtr A = Placed(*a, c.pa), B = Placed(*b, c.pb);
        ASSERT_TRUE(A && B);
        const bool overlap = Ops::BVOverLap(a, b, c.tol, c.pa, c.pb);
        const double minD = Ops::GetMinimumDistance(a, b, c.tol, c.pa, c.pb);
        const double maxD = Ops::GetMaximumDistance(a, b, c.tol, c.pa, c.pb);
        ++cases;
        if (c.tol == 0.0 || k1 != k2)
        {
          EXPECT_EQ(overlap, Ops::BVOverLap(b, a, c.tol, c.pb, c.pa));
          EXPECT_NEAR(minD, Ops::GetMinimumDistance(b, a, c.tol, c.pb, c.pa), 1e-12 * (1 + minD));
        }
        EXPECT_GE(minD, 0.0);
        EXPECT_NEAR(Ops::GetSquareMinimumDistance(a, b, c.tol, c.pa, c.pb), minD * minD, 1e-12 * (1 + minD * minD));
        const double maxSq = Ops::GetSquareMaximumDistance(a, b, c.tol, c.pa, c.pb);
        if (maxD >= 1e40)
        {
          EXPECT_EQ(maxSq, 1e40);
        }
        else
        {
          EXPECT_NEAR(maxSq, maxD * maxD, 1e-12 * maxD * maxD);
        }

        bool shared = false;
        if (c.built)
        {
          ASSERT_TRUE(P::IsPointInsideBV(*A, c.shared) && P::IsPointInsideBV(*B, c.shared));
          shared = true;
        }
        std::vector<RKMMathPoint> ps, qs;
        for (int s = 0; s < 32; ++s)
        {
          const RKMMathPoint p = c.pa ? c.Ta * SampleInside(g, *a) : SampleInside(g, *a);
          const RKMMathPoint q = c.pb ? c.Tb * SampleInside(g, *b) : SampleInside(g, *b);
          shared = shared || P::IsPointInsideBV(*B, p) || P::IsPointInsideBV(*A, q);
          ps.push_back(p);
          qs.push_back(q);
        }
        if (shared)
        {
          ++witnessed;
          EXPECT_TRUE(overlap) << "a shared point was found";
          EXPECT_EQ(minD, 0.0);
        }
        for (size_t s = 0; s < ps.size(); ++s)
        {
          const double d = ps[s].DistanceTo(qs[s]), eps = 1e-9 * Scale(ps[s], qs[s]);
          ASSERT_LE(minD, std::fmax(0.0, d - c.tol) + eps) << "sample pair " << s;
          ASSERT_GE(maxD, d + c.tol - eps) << "sample pair " << s;
        }
        if (Unbounded(k1) || Unbounded(k2))
        {
          EXPECT_GE(maxD, 1e30);
        }

        // Travel along the line through a witness pair: moving a's point onto b's is one way to meet.
        const RKMMathPoint &p = ps[0], &q = qs[0];
        const RKMMathVector dir = (q - p) * Uniform(g, 0.1, 10.0);
        const double reach = std::fmax(0.0, p.DistanceTo(q) - c.tol) + 1e-9 * Scale(p, q);
        // The sphere pair takes its travel on the side dir points to (see SphereSphereEitherSense); the
        // witness direction points from a towards b, which is that side.
        const bool eitherSense = !(k1 == kSphere && k2 == kSphere);
        for (const RKMMathVector &d : {dir, -dir})
        {
          if (!eitherSense && d != dir)
            continue;
          double out = -1.0;
          ASSERT_TRUE(Ops::GetSquareMinDirDistance(a, b, d, out, c.tol, c.pa, c.pb));
          EXPECT_LE(std::sqrt(out), reach);
          if (shared)
          {
            EXPECT_EQ(out, 0.0);
          }
          // A march of a's samples along the line: every meeting found caps the travel.
          if (d != dir)
            continue;
          RKMMathVector u = d;
          u.Normalize();
          const double span = p.DistanceTo(q) + 2.0;
          for (size_t s = 0; s < 16; ++s)
            for (int step = -60; step <= 60; ++step)
            {
              const double tau = span * step / 60.0;
              const RKMMathPoint moved = ps[s] + u * tau;
              if (P::IsPointInsideBV(*B, moved))
              {
                ASSERT_LE(std::sqrt(out), std::fabs(tau) + 1e-9 * Scale(moved, ps[s])) << "sample " << s;
              }
            }
        }

        // Far apart, bounded volumes are told apart.
        if (!Unbounded(k1) && !Unbounded(k2))
        {
          const T3 away(RKMMathVector(1e3, -2e3, 5e2));
          const T3 farB = away * (c.pb ? c.Tb : T3());
          EXPECT_FALSE(Ops::BVOverLap(a, b, c.tol, c.pa, &farB));
          EXPECT_GT(Ops::GetMinimumDistance(a, b, c.tol, c.pa, &farB), 1e3);
          double out = -1.0;
          if (Ops::GetSquareMinDirDistance(a, b, RKMMathVector(1, -2, 0.5), out, c.tol, c.pa, &farB))
          {
            EXPECT_GT(out, 1e6);
          }
        }
      }
    }
  // Half the cases are built to overlap: the checks above must not have been vacuous.
  EXPECT_GT(witnessed, cases / 3);
}

TEST(RKMPolyBVBVDistance, KnownPairs)
{
  const RKMPolyBoundingSphere at5(RKMMathPoint(5, 0, 0), 1.0);
  EXPECT_DOUBLE_EQ(Ops::GetMinimumDistance(&kUnitAt0, &at5, 0.0, nullptr, nullptr), 3.0);
  EXPECT_DOUBLE_EQ(Ops::GetSquareMinimumDistance(&kUnitAt0, &at5, 0.0, nullptr, nullptr), 9.0);
  EXPECT_DOUBLE_EQ(Ops::GetMinimumDistance(&kUnitAt0, &at5, 0.5, nullptr, nullptr), 2.5);
  const T3 by5(RKMMathVector(0, 0, 5));
  EXPECT_DOUBLE_EQ(Ops::GetSquareMinimumDistance(&kUnitAt0, &kUnitAt0, 0.0, &by5, nullptr), 9.0);
  EXPECT_NEAR(Ops::GetMaximumDistance(&kUnitAt0, &at5, 0.0, nullptr, nullptr), 7.0, 1e-12);
  EXPECT_NEAR(Ops::GetSquareMaximumDistance(&kUnitAt0, &at5, 0.0, nullptr, nullptr), 49.0, 1e-11);
  EXPECT_EQ(Ops::GetMinimumDistance(&kUnitAt0, &kUnitAt0, 0.0, nullptr, nullptr), 0.0);

  // Float boxes are rounded outward by up to an ulp, hence the looser bounds where one takes part.
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1));
  const RKMPolyBoundingSphere right(RKMMathPoint(3, 0.5, 0.5), 1.0);
  EXPECT_NEAR(Ops::GetMinimumDistance(&box, &right, 0.0, nullptr, nullptr), 1.0, 1e-6);
  const double farthest = std::sqrt(9.5) + 1.0;
  EXPECT_GE(Ops::GetMaximumDistance(&right, &box, 0.0, nullptr, nullptr), farthest);
  EXPECT_NEAR(Ops::GetMaximumDistance(&right, &box, 0.0, nullptr, nullptr), farthest, 1e-6);

  const RKMPolyBoundingCylinder capsule(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 2.0);
  const RKMPolyBoundingSphere beyondEnd(RKMMathPoint(6, 0, 0), 1.0), beside(RKMMathPoint(0, 5, 0), 1.0);
  EXPECT_NEAR(Ops::GetMinimumDistance(&capsule, &beyondEnd, 0.0, nullptr, nullptr), 2.0, 1e-12);
  EXPECT_NEAR(Ops::GetMinimumDistance(&beside, &capsule, 0.0, nullptr, nullptr), 3.0, 1e-12);
  const RKMPolyBoundingCylinder parallel(RKMMathPoint(1, 4, 0), RKMMathVector(1, 0, 0), 1.0, 2.0);
  const RKMPolyBoundingCylinder crossing(RKMMathPoint(0, 0, 5), RKMMathVector(0, 1, 0), 0.5, 2.0);
  const RKMPolyBoundingCylinder skewEnds(RKMMathPoint(5, 0, 4), RKMMathVector(0, 0, 1), 0.5, 1.0);
  EXPECT_NEAR(Ops::GetMinimumDistance(&capsule, &parallel, 0.0, nullptr, nullptr), 2.0, 1e-12);
  EXPECT_NEAR(Ops::GetMinimumDistance(&crossing, &capsule, 0.0, nullptr, nullptr), 3.5, 1e-12);
  EXPECT_NEAR(Ops::GetMinimumDistance(&capsule, &skewEnds, 0.0, nullptr, nullptr), std::sqrt(9.0 + 9.0) - 1.5, 1e-12);
  // Segment to box, measured from the end of the axis and from its side.
  const RKMPolyAABB ahead(RKMMathBox(4, 5, -0.5, 0.5, -0.5, 0.5)), above(RKMMathBox(-1, 1, 3, 4, -1, 1));
  EXPECT_NEAR(Ops::GetMinimumDistance(&capsule, &ahead, 0.0, nullptr, nullptr), 1.0, 1e-6);
  EXPECT_NEAR(Ops::GetMinimumDistance(&above, &capsule, 0.0, nullptr, nullptr), 2.0, 1e-6);
  const RKMPolyBoundingCylinder infinite(RKMMathPoint(), RKMMathVector(1, 0, 0), 1.0, 0.0);
  const RKMPolyAABB offAxis(RKMMathBox(100, 101, 3, 4, -0.5, 0.5));
  EXPECT_NEAR(Ops::GetMinimumDistance(&infinite, &offAxis, 0.0, nullptr, nullptr), 2.0, 1e-6);
  EXPECT_EQ(Ops::GetMaximumDistance(&infinite, &offAxis, 0.0, nullptr, nullptr), 1e30);
  EXPECT_EQ(Ops::GetMaximumDistance(&offAxis, &infinite, 0.0, nullptr, nullptr), 1e30);
  EXPECT_EQ(Ops::GetMaximumDistance(&capsule, &infinite, 0.0, nullptr, nullptr), 1e30);

  // Slabs: 1e40 when the slab comes first or follows a sphere or a box; 1e30 after a cylinder.
  const RKMPolyBoundingPlane slab(RKMMathVector(0, 0, 1), RKMMathPoint(0, 0, 10), 1.0);
  const RKMMathVector axes[3] = {RKMMathVector(1, 0, 0), RKMMathVector(0, 1, 0), RKMMathVector(0, 0, 1)};
  const RKMPolyOBB obb(axes, RKMMathVector(1, 1, 1), RKMMathPoint());
  for (const BV *other : std::initializer_list<const BV *>{&kUnitAt0, &box, &obb, &capsule, &infinite, &slab})
  {
    SCOPED_TRACE("other kind " + std::to_string(other->GetTypeID()));
    EXPECT_EQ(Ops::GetMaximumDistance(&slab, other, 0.0, nullptr, nullptr), 1e40);
    EXPECT_EQ(Ops::GetSquareMaximumDistance(&slab, other, 0.0, nullptr, nullptr), 1e40);
    EXPECT_EQ(Ops::GetMaximumDistance(other, &slab, 0.0, nullptr, nullptr),
              other->GetTypeID() == BV::TypeCylinder ? 1e30 : 1e40);
  }
  EXPECT_NEAR(Ops::GetMinimumDistance(&slab, &kUnitAt0, 0.0, nullptr, nullptr), 8.0, 1e-12);
  EXPECT_NEAR(Ops::GetMinimumDistance(&box, &slab, 0.5, nullptr, nullptr), 7.5, 1e-6);
  // An infinite cylinder parallel to the slab stays clear of it; tilted, it crosses it.
  EXPECT_NEAR(Ops::GetMinimumDistance(&slab, &infinite, 0.0, nullptr, nullptr), 8.0, 1e-12);
  const RKMPolyBoundingCylinder tilted(RKMMathPoint(), RKMMathVector(1, 0, 1e-6), 1.0, -1.0);
  EXPECT_EQ(Ops::GetMinimumDistance(&tilted, &slab, 0.0, nullptr, nullptr), 0.0);
  EXPECT_TRUE(Ops::BVOverLap(&slab, &tilted, 0.0, nullptr, nullptr));
}

// The travel for two spheres follows from |w − τ·d| = R along the unit direction d; the formula below
// gives the contact on the side d points to, which is the nearer one when d·w > 0.
TEST(RKMPolyBVBVMinDir, SphereSphereMatchesTheClosedForm)
{
  Rng g(601);
  SCOPED_TRACE("seed 601");
  int hits = 0, misses = 0;
  for (int n = 0; n < 400; ++n)
  {
    const RKMPolyBoundingSphere s1(RandomPoint(g, 4), Uniform(g, 0.1, 2)), s2(RandomPoint(g, 4), Uniform(g, 0.1, 2));
    const T3 T1(RandomPoint(g, 3).AsVector()), T2(RandomPoint(g, 3).AsVector());
    const double tol = n % 2 ? 0.0 : Uniform(g, 0, 0.2);
    const RKMMathVector w = (T2 * s2.GetCenter()) - (T1 * s1.GetCenter());
    RKMMathVector d = n % 3 ? RandomUnit(g) : w + RandomUnit(g) * Uniform(g, 0, 3);
    if (d * w < 0)
      d = -d;
    d *= Uniform(g, 0.01, 100);
    const double R = s1.GetRadius() + tol + s2.GetRadius();
    const double k = (d ^ w).SquareNorm() / (d.SquareNorm() * R * R);
    double out = -7.0;
    const bool met = Ops::GetSquareMinDirDistance(&s1, &s2, d, out, tol, &T1, &T2);
    SCOPED_TRACE("case " + std::to_string(n));
    if (w.Norm() <= R * (1 - 1e-9))
    {
      EXPECT_TRUE(met);
      EXPECT_EQ(out, 0.0);
    }
    else if (k > 1 + 1e-9)
    {
      ++misses;
      EXPECT_FALSE(met);
      EXPECT_EQ(out, -7.0);
    }
    else if (k < 1 - 1e-9 && w.Norm() > R * (1 + 1e-9))
    {
      ++hits;
      ASSERT_TRUE(met);
      const double tau = (d * w) / d.Norm() - R * std::sqrt(1 - k);
      EXPECT_NEAR(out, tau * tau, 1e-9 * (1 + tau * tau));
      double swapped = -7.0;
      ASSERT_TRUE(Ops::GetSquareMinDirDistance(&s2, &s1, -d, swapped, tol, &T2, &T1));
      EXPECT_NEAR(swapped, out, 1e-9 * (1 + out));
    }
  }
  EXPECT_GT(hits, 50);
  EXPECT_GT(misses, 50);
}

// Either sense of the line counts: moving the first sphere by −3·(−x) meets the second one.
TEST(RKMPolyBVBVMinDir, SphereSphereEitherSense)
{
  const RKMPolyBoundingSphere at5(RKMMathPoint(5, 0, 0), 1.0);
  double out = -1.0;
  ASSERT_TRUE(Ops::GetSquareMinDirDistance(&kUnitAt0, &at5, RKMMathVector(-1, 0, 0), out, 0.0, nullptr, nullptr));
  EXPECT_DOUBLE_EQ(out, 9.0);
}

TEST(RKMPolyBVBVMinDir, ZeroDirectionAndSensesOfTheLine)
{
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1));
  const RKMPolyBoundingCylinder capsule(RKMMathPoint(0.5, 0.5, 3), RKMMathVector(1, 0, 0), 0.5, 1.0);
  const RKMPolyBoundingSphere inBox(RKMMathPoint(0.5, 0.5, 0.5), 0.1), aside(RKMMathPoint(5, 0.5, 0.5), 1.0);
  const RKMMathVector zero;
  double out = -1.0;
  EXPECT_TRUE(Ops::GetSquareMinDirDistance(&box, &inBox, zero, out, 0.0, nullptr, nullptr));
  EXPECT_EQ(out, 0.0);
  for (const BV *other : std::initializer_list<const BV *>{&aside, &capsule})
  {
    out = -1.0;
    EXPECT_FALSE(Ops::GetSquareMinDirDistance(&box, other, zero, out, 0.0, nullptr, nullptr));
    EXPECT_FALSE(Ops::GetSquareMinDirDistance(other, &box, zero, out, 0.0, nullptr, nullptr));
    EXPECT_EQ(out, -1.0);
  }
  EXPECT_FALSE(Ops::GetSquareMinDirDistance(&kUnitAt0, &aside, zero, out, 0.0, nullptr, nullptr));
  // The sphere sits 3 past the box along x; the box reaches it moving either way along the line.
  for (const RKMMathVector &d : {RKMMathVector(2, 0, 0), RKMMathVector(-0.5, 0, 0)})
  {
    out = -1.0;
    ASSERT_TRUE(Ops::GetSquareMinDirDistance(&box, &aside, d, out, 0.0, nullptr, nullptr));
    EXPECT_NEAR(out, 9.0, 1e-5);
    ASSERT_TRUE(Ops::GetSquareMinDirDistance(&aside, &box, d, out, 0.0, nullptr, nullptr));
    EXPECT_NEAR(out, 9.0, 1e-5);
    ASSERT_TRUE(Ops::GetSquareMinDirDistance(&aside, &box, d, out, 0.5, nullptr, nullptr));
    EXPECT_NEAR(out, 2.5 * 2.5, 1e-5);
  }
  // The capsule sits 1.5 above the box; its stand-in may meet the box sooner, never later.
  EXPECT_TRUE(Ops::GetSquareMinDirDistance(&capsule, &box, RKMMathVector(0, 0, -1), out, 0.0, nullptr, nullptr));
  EXPECT_LE(out, 1.5 * 1.5 + 1e-9);
}

// The header promises an untouched output when the volumes never meet.
TEST(RKMPolyBVBVMinDir, MissLeavesTheOutputUntouched)
{
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1));
  const RKMPolyBoundingSphere far(RKMMathPoint(5, 5, 0.5), 1.0);
  double out = -1.0;
  EXPECT_FALSE(Ops::GetSquareMinDirDistance(&box, &far, RKMMathVector(1, 0, 0), out, 0.0, nullptr, nullptr));
  EXPECT_EQ(out, -1.0);
}

bool BoxesMeet(const RKMMathOBBBase &fixed, const RKMMathOBBBase &moving, const RKMMathVector &u, double tau)
{
  const RKMMathVector axes[3] = {moving.U(), moving.V(), moving.W()};
  return fixed.IsIntersecting(RKMMathOBBBase(axes, moving.Diagonal(), moving.Center() + u * tau));
}

// The reported travel is the contact itself: a little less in either sense leaves the volumes apart, a
// little more in one sense makes them meet; a miss means no travel along the line meets.
template <class Meets>
void ExpectContactAt(bool met, double out, Meets meets, const RKMMathVector &u, int &hits, int &misses)
{
  if (met)
  {
    ++hits;
    const double t = std::sqrt(out);
    if (t == 0.0)
    {
      EXPECT_TRUE(meets(u, 0.0));
      return;
    }
    const double below = t * (1 - 1e-7) - 1e-9, above = t * (1 + 1e-7) + 1e-9;
    EXPECT_FALSE(meets(u, below) || meets(u, -below)) << "travel " << t;
    EXPECT_TRUE(meets(u, above) || meets(u, -above)) << "travel " << t;
    return;
  }
  ++misses;
  EXPECT_EQ(out, 1e49);
  for (int step = -600; step <= 600; ++step)
    ASSERT_FALSE(meets(u, step * 0.05)) << "met at " << step * 0.05;
}

TEST(RKMPolyOBBSweep, SquareDistanceMinDirIsTheContact)
{
  Rng g(602);
  SCOPED_TRACE("seed 602");
  int hits = 0, misses = 0;
  for (int n = 0; n < 240; ++n)
  {
    SCOPED_TRACE("case " + std::to_string(n));
    const BVPtr a = RandomVolume(g, kOBB), b = RandomVolume(g, kOBB);
    const RKMPolyOBB &fixed = static_cast<const RKMPolyOBB &>(*a), &other = static_cast<const RKMPolyOBB &>(*b);
    RKMMathVector d = n % 2 ? RandomUnit(g) : (fixed.Center() - other.Center()) + RandomUnit(g) * Uniform(g, 0, 2);
    d *= Uniform(g, 0.01, 10);
    RKMMathVector u = d;
    u.Normalize();
    double out = -1.0;
    const bool met = fixed.SquareDistanceMinDir(other, d, out);
    ExpectContactAt(
        met, out,
        [&](const RKMMathVector &v, double tau) { return BoxesMeet(fixed.GetBase(), other.GetBase(), v, tau); }, u,
        hits, misses);

    const RKMPolyBoundingSphere ball(RandomPoint(g, 3), Uniform(g, 0.1, 2));
    out = -1.0;
    const bool ballMet = fixed.SquareDistanceMinDir(ball.GetCenter(), ball.GetRadius(), d, out);
    const double r2 = ball.GetRadius() * ball.GetRadius();
    ExpectContactAt(
        ballMet, out,
        [&](const RKMMathVector &v, double tau) { return fixed.SquareDistanceMin(ball.GetCenter() + v * tau) <= r2; },
        u, hits, misses);
    if (HasFatalFailure())
      return;
  }
  EXPECT_GT(hits, 100);
  EXPECT_GT(misses, 50);

  // Too short a direction is refused (the output untouched) unless the sphere already overlaps.
  const RKMMathVector axes[3] = {RKMMathVector(1, 0, 0), RKMMathVector(0, 1, 0), RKMMathVector(0, 0, 1)};
  const RKMPolyOBB unit(axes, RKMMathVector(1, 1, 1), RKMMathPoint());
  const RKMPolyOBB shifted(axes, RKMMathVector(1, 1, 1), RKMMathPoint(5, 0, 0));
  double out = -1.0;
  EXPECT_FALSE(unit.SquareDistanceMinDir(shifted, RKMMathVector(1e-4, 0, 0), out));
  EXPECT_FALSE(unit.SquareDistanceMinDir(RKMMathPoint(5, 0, 0), 1.0, RKMMathVector(), out));
  EXPECT_FALSE(unit.SquareDistanceMinDir(RKMMathPoint(5, 0, 0), -1.0, RKMMathVector(1, 0, 0), out));
  EXPECT_FALSE(RKMPolyOBB().SquareDistanceMinDir(shifted, RKMMathVector(1, 0, 0), out));
  EXPECT_EQ(out, -1.0);
  EXPECT_TRUE(unit.SquareDistanceMinDir(RKMMathPoint(1.5, 0, 0), 1.0, RKMMathVector(), out));
  EXPECT_EQ(out, 0.0);
  ASSERT_TRUE(unit.SquareDistanceMinDir(shifted, RKMMathVector(-3, 0, 0), out));
  EXPECT_NEAR(out, 9.0, 1e-9);
  ASSERT_TRUE(unit.SquareDistanceMinDir(RKMMathPoint(5, 0, 0), 1.0, RKMMathVector(0.5, 0, 0), out));
  EXPECT_NEAR(out, 9.0, 1e-9);
}
} // namespace
