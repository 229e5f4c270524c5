#include "RKMPolyBVTestUtil.h"

#include "RKMPolyBVBVOperations.h"

#include <gtest/gtest.h>

#include <cmath>
#include <string>
#include <vector>

namespace
{
using namespace bvtest;
using BV = RKMPolyBoundingVolume;
using Ops = RKMPolyBVBVOperations;
using T3 = RKMMathTransformation;

const RKMPolyBoundingSphere kUnit(RKMMathPoint(), 1.0);
const RKMMathVector kAxes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};

bool Meets(const BV *a, const BV *b, double tol = 0.0, const T3 *Ta = nullptr, const T3 *Tb = nullptr)
{
  return Ops::BVOverLap(a, b, tol, Ta, Tb);
}
double MinD(const BV *a, const BV *b, double tol = 0.0, const T3 *Ta = nullptr, const T3 *Tb = nullptr)
{
  return Ops::GetMinimumDistance(a, b, tol, Ta, Tb);
}
double MaxD(const BV *a, const BV *b, double tol = 0.0, const T3 *Ta = nullptr, const T3 *Tb = nullptr)
{
  return Ops::GetMaximumDistance(a, b, tol, Ta, Tb);
}
bool Dir(const BV *a, const BV *b, const RKMMathVector &d, double &out, double tol = 0.0, const T3 *Ta = nullptr,
         const T3 *Tb = nullptr)
{
  return Ops::GetSquareMinDirDistance(a, b, d, out, tol, Ta, Tb);
}

TEST(RKMPolyBVBVOverlap, TouchingCountsAndToleranceBridgesTheGap)
{
  const RKMPolyBoundingSphere at2({2, 0, 0}, 1), past({2.0001, 0, 0}, 1), near({3.9, 0, 0}, 1), far({4.1, 0, 0}, 1),
      farAway({1e6, 0, 0}, 1);
  const RKMPolyBoundingPlane low({0, 0, 1}, {}, 1), touching({0, 0, 1}, {0, 0, 2}, 1),
      apart({0, 0, -1}, {0, 0, 2.0001}, 1), tilted({0, 1e-3, 1}, {0, 0, 50}, 0.1); // not parallel: always cross
  const RKMPolyBoundingCylinder capsule({}, {1, 0, 0}, 1, 2), infinite({}, {1, 0, 0}, 1, 0);
  const T3 by2(RKMMathVector(2, 0, 0)), byPast(RKMMathVector(2.0001, 0, 0));
  const struct
  {
    const BV &a, &b;
    double tol;
    const T3 *Ta, *Tb;
    bool meets;
  } cases[] = {{kUnit, at2, 0, nullptr, nullptr, true},       {kUnit, past, 0, nullptr, nullptr, false},
               {kUnit, past, 1e-3, nullptr, nullptr, true},   {kUnit, kUnit, 0, nullptr, &by2, true},
               {kUnit, kUnit, 0, &byPast, nullptr, false},    {low, touching, 0, nullptr, nullptr, true},
               {low, apart, 0, nullptr, nullptr, false},      {low, apart, 1e-3, nullptr, nullptr, true},
               {low, tilted, 0, nullptr, nullptr, true},      {capsule, near, 0, nullptr, nullptr, true},
               {capsule, far, 0, nullptr, nullptr, false},    {far, capsule, 0, nullptr, nullptr, false},
               {infinite, near, 0, nullptr, nullptr, true},   {far, infinite, 0, nullptr, nullptr, true},
               {infinite, farAway, 0, nullptr, nullptr, true}};
  for (const auto &c : cases)
    EXPECT_EQ(Meets(&c.a, &c.b, c.tol, c.Ta, c.Tb), c.meets) << "case " << &c - cases;
  EXPECT_TRUE(Ops::BVOverLapOnePos(&kUnit, &kUnit, RKMMathVector(0, -2, 0), 0.0));
}

TEST(RKMPolyBVBVOverlap, EmptyNullAndUnknownVolumes)
{
  RKMPolyBoundingPlane allSpace;
  allSpace.SetInfinitelyThick(1);
  const RKMPolyBoundingSphere negative({}, -1.0), farAway({1e9, -1e9, 3}, 0.1), distant({1e6, 0, 0}, 1.0);
  const RKMPolyOBB undefined;
  const RKMPolyAABB emptyBox, box(RKMMathBox(-5, 5, -5, 5, -5, 5));
  const RKMPolyBoundingCylinder emptyCapsule({}, {1, 0, 0}, -1.0, 2.0), infinite({}, {1, 0, 0}, 10.0, -1.0);
  const RKMPolyBoundingPlane slab({0, 0, 1}, {}, 10.0);
  const T3 shift(RKMMathVector(0.5, 0, 0));
  for (const BV *e : BVs{&negative, &undefined, &emptyBox, &emptyCapsule})
  {
    for (const BV *o : BVs{&kUnit, &box, &slab, &infinite, &negative, &undefined})
    {
      SCOPED_TRACE("empty kind " + std::to_string(e->GetTypeID()) + ", other kind " + std::to_string(o->GetTypeID()));
      EXPECT_FALSE(Meets(e, o) || Meets(o, e, 0.5, &shift) || Ops::BVOverlapNoPos(e, o, 0.0) ||
                   Ops::BVOverLapOnePos(o, e, RKMMathVector(), 0.0));
      EXPECT_TRUE(MinD(e, o) == -1.0 && Ops::GetSquareMaximumDistance(o, e, 0.0, nullptr, nullptr) == -1.0);
      double out = 7.0;
      EXPECT_FALSE(Dir(e, o, RKMMathVector(1, 0, 0), out));
      EXPECT_EQ(out, 7.0);
    }
    // All of space meets even an empty volume, but the one-placement form refuses empty volumes.
    EXPECT_TRUE(Meets(&allSpace, e) && Meets(e, &allSpace, 0.0, &shift, &shift));
    EXPECT_FALSE(Ops::BVOverLapOnePos(&allSpace, e, 0.0, &shift));
  }
  EXPECT_TRUE(Meets(&farAway, &allSpace, 0.0, nullptr, &shift));
  EXPECT_EQ(MinD(&allSpace, &farAway), 0.0);
  // A tolerance can empty the volume it enlarges.
  EXPECT_FALSE(Meets(&kUnit, &kUnit, -3.0) || Ops::BVOverlapNoPos(&kUnit, &kUnit, -3.0));
  EXPECT_FALSE(Meets(nullptr, &box) || Meets(&box, nullptr) || Ops::BVOverLapOnePos(nullptr, &box, 0.0, nullptr) ||
               Ops::BVOverLapOnePos(&box, nullptr, RKMMathVector(), 0.0) || Ops::BVOverlapNoPos(&box, nullptr, 0.0));
  // Nothing is known about an unknown kind, so its overlap cannot be ruled out; it has no distances.
  const UnknownBV unknown;
  EXPECT_TRUE(Meets(&unknown, &distant) && Meets(&distant, &unknown, 0.0, nullptr, &shift) &&
              Ops::BVOverlapNoPos(&unknown, &unknown, 0.0));
  for (const auto &[a, b] :
       {std::pair<const BV *, const BV *>{nullptr, &box}, {&box, nullptr}, {&unknown, &distant}, {&distant, &unknown}})
  {
    EXPECT_TRUE(MinD(a, b) == -1.0 && MaxD(a, b) == -1.0);
    EXPECT_TRUE(Ops::GetSquareMinimumDistance(a, b, 0.0, nullptr, nullptr) == -1.0 &&
                Ops::GetSquareMaximumDistance(a, b, 0.0, nullptr, nullptr) == -1.0);
  }
}

// A sphere, a short capsule or a slab just off the corner of a unit box along (1, 1, 1): the round
// volume grown by the tolerance stays clear, the box grown by it would reach. So the answer tells which
// of the two took the tolerance: it must be the lower-ranked one, in either order and every form.
TEST(RKMPolyBVBVOverlap, ToleranceEnlargesTheOwningKind)
{
  const double a = 0.45, tol = 0.5;
  const RKMMathPoint offCorner(1 + a, 1 + a, 1 + a);
  const RKMPolyAABB aabb(RKMMathBox(0, 1, 0, 1, 0, 1));
  const RKMPolyOBB obb(kAxes, RKMMathVector(0.5, 0.5, 0.5), RKMMathPoint(0.5, 0.5, 0.5));
  const RKMPolyBoundingSphere ball(offCorner, 0.1);
  const RKMPolyBoundingCylinder capsule(offCorner, RKMMathVector(1, -1, 0), 0.1, 1e-3);
  const RKMPolyBoundingPlane slab(RKMMathVector(1, 1, 1), offCorner + RKMMathVector(1, 1, 1) * (0.1 / std::sqrt(3.0)),
                                  0.1);
  const T3 slide(RKMMathVector(-0.5, 0.25, 0.25));
  for (const BV *round : BVs{&ball, &capsule, &slab})
    for (const BV *box : BVs{&aabb, &obb})
    {
      SCOPED_TRACE("owner kind " + std::to_string(round->GetTypeID()) + ", box kind " +
                   std::to_string(box->GetTypeID()));
      EXPECT_FALSE(Meets(round, box, tol) || Meets(box, round, tol) || Meets(box, round, tol, &slide, &slide) ||
                   Ops::BVOverLapOnePos(box, round, tol, nullptr) || Ops::BVOverlapNoPos(box, round, tol));
      EXPECT_GT(MinD(box, round, tol), 0.0);
      EXPECT_EQ(MinD(box, round, tol, &slide, &slide), MinD(round, box, tol, &slide, &slide));
      EXPECT_TRUE(Meets(box, round, 0.8)) << "a larger tolerance on the owner bridges the gap";
    }
}

// The forms with fewer placements are the general form with the missing ones as identity.
TEST(RKMPolyBVBVOverlap, ShorterFormsAgreeWithTheGeneralOne)
{
  Rng g(401);
  for (int n = 0; n < 300; ++n)
  {
    const int k1 = n % kVKindCount, k2 = (n / kVKindCount) % kVKindCount;
    const BVPtr a = RandomVolume(g, k1), b = RandomVolume(g, k2);
    const T3 T = RandomTransformation(g, kAllTKinds[n % 4]);
    const RKMMathVector v = RandomPoint(g, 4).AsVector();
    const T3 byV(v);
    const double tol = n % 3 ? 0.0 : Uniform(g, 0, 0.3);
    SCOPED_TRACE(std::string(Name(k1)) + " / " + Name(k2) + ", seed 401, case " + std::to_string(n));
    EXPECT_EQ(Ops::BVOverLapOnePos(a.get(), b.get(), tol, &T), Meets(a.get(), b.get(), tol, nullptr, &T));
    EXPECT_EQ(Ops::BVOverLapOnePos(a.get(), b.get(), v, tol), Meets(a.get(), b.get(), tol, nullptr, &byV));
    EXPECT_EQ(Ops::BVOverlapNoPos(a.get(), b.get(), tol), Meets(a.get(), b.get(), tol));
  }
}

double Scale(const RKMMathPoint &p, const RKMMathPoint &q)
{
  return 1.0 + std::fabs(p.x) + std::fabs(p.y) + std::fabs(p.z) + std::fabs(q.x) + std::fabs(q.y) + std::fabs(q.z);
}

// For every ordered pair of kinds, random volumes and placements, half of them built to share a point
// (b's placement maps one of b's inner points onto the image of one of a's): a point found in both
// placed volumes means an overlap; sampled point pairs bound the minimum distance from above and the
// maximum from below (widened by the tolerance, which grows the owner by at least that much); a
// witness pair p, q bounds the travel along q − p, in both senses, as does every meeting found by
// marching a's samples along that line.
TEST(RKMPolyBVBVOverlap, RandomPairsAgainstSampledPoints)
{
  int witnessed = 0, cases = 0;
  for (int k1 = 0; k1 < kVKindCount; ++k1)
    for (int k2 = 0; k2 < kVKindCount; ++k2)
    {
      const unsigned seed = 500 + 10 * static_cast<unsigned>(k1) + static_cast<unsigned>(k2);
      Rng g(seed);
      for (int n = 0; n < 40; ++n, ++cases)
      {
        SCOPED_TRACE(std::string(Name(k1)) + " / " + Name(k2) + ", seed " + std::to_string(seed) + ", case " +
                     std::to_string(n));
        const BVPtr bva = RandomVolume(g, k1), bvb = RandomVolume(g, k2);
        const BV *a = bva.get(), *b = bvb.get();
        T3 Ta = RandomTransformation(g, kAllTKinds[n % 4]), Tb = RandomTransformation(g, kAllTKinds[(n / 4) % 4]);
        const T3 *pa = n % 5 == 1 ? nullptr : &Ta, *pb = n % 7 == 2 ? nullptr : &Tb;
        const double tol = n % 2 ? 0.0 : Uniform(g, 0.0, 0.05);
        const bool built = n % 2 == 0 && pb;
        RKMMathPoint common;
        if (built)
        {
          const RKMMathPoint p = SampleInside(g, *a, 3.0), q = SampleInside(g, *b, 3.0);
          common = pa ? Ta * p : p;
          Tb.SetTranslation(common - RKMMathPoint(Tb.GetMatrix() * q.AsVector()));
        }
        const BVPtr A = Placed(*a, pa), B = Placed(*b, pb);
        ASSERT_TRUE(A && B);
        const bool overlap = Meets(a, b, tol, pa, pb);
        const double minD = MinD(a, b, tol, pa, pb), maxD = MaxD(a, b, tol, pa, pb);
        if (tol == 0.0 || k1 != k2)
        {
          EXPECT_EQ(overlap, Meets(b, a, tol, pb, pa));
          EXPECT_NEAR(minD, MinD(b, a, tol, pb, pa), 1e-12 * (1 + minD));
        }
        EXPECT_GE(minD, 0.0);
        EXPECT_NEAR(Ops::GetSquareMinimumDistance(a, b, tol, pa, pb), minD * minD, 1e-12 * (1 + minD * minD));
        const double maxSq = Ops::GetSquareMaximumDistance(a, b, tol, pa, pb);
        EXPECT_TRUE(maxD >= 1e40 ? maxSq == 1e40 : std::fabs(maxSq - maxD * maxD) <= 1e-12 * maxD * maxD) << maxSq;
        EXPECT_TRUE((!Unbounded(k1) && !Unbounded(k2)) || maxD >= 1e30);
        ASSERT_TRUE(!built || (P::IsPointInsideBV(*A, common) && P::IsPointInsideBV(*B, common)));
        bool shared = built;
        std::vector<RKMMathPoint> ps, qs;
        for (int s = 0; s < 32; ++s)
        {
          ps.push_back(pa ? Ta * SampleInside(g, *a) : SampleInside(g, *a));
          qs.push_back(pb ? Tb * SampleInside(g, *b) : SampleInside(g, *b));
          shared = shared || P::IsPointInsideBV(*B, ps.back()) || P::IsPointInsideBV(*A, qs.back());
          const double d = ps[s].DistanceTo(qs[s]), eps = 1e-9 * Scale(ps[s], qs[s]);
          ASSERT_LE(minD, std::fmax(0.0, d - tol) + eps) << "sample pair " << s;
          ASSERT_GE(maxD, d + tol - eps) << "sample pair " << s;
        }
        witnessed += shared;
        EXPECT_TRUE(!shared || (overlap && minD == 0.0)) << "a shared point was found";

        // Travel along the line through a witness pair: moving a's point onto b's is one way to meet.
        // (Two spheres take the travel on the side the direction points to: see SphereSphereEitherSense.)
        const RKMMathPoint &p = ps[0], &q = qs[0];
        const RKMMathVector dir = (q - p) * Uniform(g, 0.1, 10.0);
        const double reach = std::fmax(0.0, p.DistanceTo(q) - tol) + 1e-9 * Scale(p, q);
        for (int sense = 0; sense < (k1 == kSphere && k2 == kSphere ? 1 : 2); ++sense)
        {
          double out = -1.0;
          ASSERT_TRUE(Dir(a, b, sense ? -dir : dir, out, tol, pa, pb));
          EXPECT_LE(std::sqrt(out), reach);
          EXPECT_TRUE(!shared || out == 0.0);
          RKMMathVector u = dir;
          u.Normalize();
          const double span = p.DistanceTo(q) + 2.0;
          for (size_t s = 0; s < 16 && sense == 0; ++s)
            for (int step = -60; step <= 60; ++step)
            {
              const RKMMathPoint moved = ps[s] + u * (span * step / 60.0);
              ASSERT_TRUE(!P::IsPointInsideBV(*B, moved) ||
                          std::sqrt(out) <= std::fabs(span * step / 60.0) + 1e-9 * Scale(moved, ps[s]))
                  << "sample " << s;
            }
        }
        // Far apart, bounded volumes are told apart.
        if (Unbounded(k1) || Unbounded(k2))
          continue;
        const T3 farB = T3(RKMMathVector(1e3, -2e3, 5e2)) * (pb ? Tb : T3());
        EXPECT_FALSE(Meets(a, b, tol, pa, &farB));
        EXPECT_GT(MinD(a, b, tol, pa, &farB), 1e3);
        double out = -1.0;
        EXPECT_TRUE(!Dir(a, b, RKMMathVector(1, -2, 0.5), out, tol, pa, &farB) || out > 1e6);
      }
    }
  EXPECT_GT(witnessed, cases / 3) << "half the cases are built to overlap: the checks must not be vacuous";
}

TEST(RKMPolyBVBVDistance, KnownPairs)
{
  const RKMPolyBoundingSphere at5({5, 0, 0}, 1.0), right({3, 0.5, 0.5}, 1.0), beyondEnd({6, 0, 0}, 1),
      beside({0, 5, 0}, 1);
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1)), ahead(RKMMathBox(4, 5, -0.5, 0.5, -0.5, 0.5)),
      above(RKMMathBox(-1, 1, 3, 4, -1, 1)), offAxis(RKMMathBox(100, 101, 3, 4, -0.5, 0.5));
  const RKMPolyBoundingCylinder capsule({}, {1, 0, 0}, 1.0, 2.0), parallel({1, 4, 0}, {1, 0, 0}, 1.0, 2.0),
      crossing({0, 0, 5}, {0, 1, 0}, 0.5, 2.0), skewEnds({5, 0, 4}, {0, 0, 1}, 0.5, 1.0), infinite({}, {1, 0, 0}, 1, 0),
      tilted({}, {1, 0, 1e-6}, 1.0, -1.0);
  const RKMPolyBoundingPlane slab({0, 0, 1}, {0, 0, 10}, 1.0);
  const RKMPolyOBB obb(kAxes, RKMMathVector(1, 1, 1), RKMMathPoint());
  const T3 by5(RKMMathVector(0, 0, 5));
  // Float boxes are rounded outward by up to an ulp, hence the looser bounds where one takes part.
  // Capsules are measured from the end and the side of the axis, parallel, crossing and skew.
  const struct
  {
    const BV &a, &b;
    double tol, expected, eps;
  } cases[] = {{kUnit, at5, 0, 3, 4e-15},
               {kUnit, at5, 0.5, 2.5, 4e-15},
               {kUnit, kUnit, 0, 0, 0},
               {box, right, 0, 1, 1e-6},
               {capsule, beyondEnd, 0, 2, 1e-12},
               {beside, capsule, 0, 3, 1e-12},
               {capsule, parallel, 0, 2, 1e-12},
               {crossing, capsule, 0, 3.5, 1e-12},
               {capsule, skewEnds, 0, std::sqrt(18.0) - 1.5, 1e-12},
               {capsule, ahead, 0, 1, 1e-6},
               {above, capsule, 0, 2, 1e-6},
               {infinite, offAxis, 0, 2, 1e-6},
               {slab, kUnit, 0, 8, 1e-12},
               {box, slab, 0.5, 7.5, 1e-6},
               {slab, infinite, 0, 8, 1e-12},
               {tilted, slab, 0, 0, 0}};
  for (const auto &c : cases)
    EXPECT_NEAR(MinD(&c.a, &c.b, c.tol), c.expected, c.eps) << "case " << &c - cases;
  EXPECT_DOUBLE_EQ(Ops::GetSquareMinimumDistance(&kUnit, &at5, 0.0, nullptr, nullptr), 9.0);
  EXPECT_DOUBLE_EQ(Ops::GetSquareMinimumDistance(&kUnit, &kUnit, 0.0, &by5, nullptr), 9.0);
  EXPECT_NEAR(MaxD(&kUnit, &at5), 7.0, 1e-12);
  EXPECT_NEAR(Ops::GetSquareMaximumDistance(&kUnit, &at5, 0.0, nullptr, nullptr), 49.0, 1e-11);
  const double farthest = std::sqrt(9.5) + 1.0;
  EXPECT_TRUE(MaxD(&right, &box) >= farthest && MaxD(&right, &box) <= farthest + 1e-6);
  EXPECT_TRUE(Meets(&slab, &tilted));
  // Unbounded: 1e30 with an infinite cylinder; with a slab 1e40, unless a cylinder comes first (1e30).
  EXPECT_TRUE(MaxD(&infinite, &offAxis) == 1e30 && MaxD(&offAxis, &infinite) == 1e30 &&
              MaxD(&capsule, &infinite) == 1e30);
  for (const BV *other : BVs{&kUnit, &box, &obb, &capsule, &infinite, &slab})
  {
    EXPECT_TRUE(MaxD(&slab, other) == 1e40 &&
                Ops::GetSquareMaximumDistance(&slab, other, 0.0, nullptr, nullptr) == 1e40);
    EXPECT_EQ(MaxD(other, &slab), other->GetTypeID() == BV::TypeCylinder ? 1e30 : 1e40) << other->GetTypeID();
  }
}

// The travel for two spheres follows from |w − τ·d| = R along the unit direction d, on the side d
// points to, which is the nearer contact when d·w > 0.
TEST(RKMPolyBVBVMinDir, SphereSphereMatchesTheClosedForm)
{
  Rng g(601);
  int hits = 0, misses = 0;
  for (int n = 0; n < 400; ++n)
  {
    SCOPED_TRACE("seed 601, case " + std::to_string(n));
    const RKMPolyBoundingSphere s1(RandomPoint(g, 4), Uniform(g, 0.1, 2)), s2(RandomPoint(g, 4), Uniform(g, 0.1, 2));
    const T3 T1(RandomPoint(g, 3).AsVector()), T2(RandomPoint(g, 3).AsVector());
    const double tol = n % 2 ? 0.0 : Uniform(g, 0, 0.2);
    const RKMMathVector w = (T2 * s2.GetCenter()) - (T1 * s1.GetCenter());
    RKMMathVector d = n % 3 ? RandomUnit(g) : w + RandomUnit(g) * Uniform(g, 0, 3);
    d *= (d * w < 0 ? -1.0 : 1.0) * Uniform(g, 0.01, 100);
    const double R = s1.GetRadius() + tol + s2.GetRadius(), k = (d ^ w).SquareNorm() / (d.SquareNorm() * R * R);
    double out = -7.0, swapped = -7.0;
    const bool met = Dir(&s1, &s2, d, out, tol, &T1, &T2);
    const int kind = w.Norm() <= R * (1 - 1e-9)                  ? 0
                     : k > 1 + 1e-9                              ? 1
                     : k < 1 - 1e-9 && w.Norm() > R * (1 + 1e-9) ? 2
                                                                 : 3;
    EXPECT_TRUE(kind != 0 || (met && out == 0.0)) << "overlapping from the start";
    EXPECT_TRUE(kind != 1 || (!met && out == -7.0)) << "never meeting";
    misses += kind == 1;
    if (kind != 2)
      continue;
    ++hits;
    ASSERT_TRUE(met);
    const double tau = (d * w) / d.Norm() - R * std::sqrt(1 - k);
    EXPECT_NEAR(out, tau * tau, 1e-9 * (1 + tau * tau));
    ASSERT_TRUE(Dir(&s2, &s1, -d, swapped, tol, &T2, &T1));
    EXPECT_NEAR(swapped, out, 1e-9 * (1 + out));
  }
  EXPECT_GT(hits, 50);
  EXPECT_GT(misses, 50);
}

// Either sense of the line counts; a zero direction meets only what already overlaps; a miss leaves
// the output untouched.
TEST(RKMPolyBVBVMinDir, ZeroDirectionSensesOfTheLineAndMisses)
{
  const RKMPolyAABB box(RKMMathBox(0, 1, 0, 1, 0, 1));
  const RKMPolyBoundingCylinder capsule({0.5, 0.5, 3}, {1, 0, 0}, 0.5, 1.0);
  const RKMPolyBoundingSphere inBox({0.5, 0.5, 0.5}, 0.1), aside({5, 0.5, 0.5}, 1.0), at5({5, 0, 0}, 1.0),
      far({5, 5, 0.5}, 1.0);
  const RKMMathVector zero;
  double out = -1.0;
  ASSERT_TRUE(Dir(&kUnit, &at5, RKMMathVector(-1, 0, 0), out)); // moving the first by −3·(−x)
  EXPECT_DOUBLE_EQ(out, 9.0);
  EXPECT_TRUE(Dir(&box, &inBox, zero, out));
  EXPECT_EQ(out, 0.0);
  out = -1.0;
  for (const BV *other : BVs{&aside, &capsule})
    EXPECT_FALSE(Dir(&box, other, zero, out) || Dir(other, &box, zero, out));
  EXPECT_FALSE(Dir(&kUnit, &aside, zero, out) || Dir(&box, &far, RKMMathVector(1, 0, 0), out));
  EXPECT_EQ(out, -1.0);
  // The sphere sits 3 past the box along x; the box reaches it moving either way along the line.
  for (const RKMMathVector &d : {RKMMathVector(2, 0, 0), RKMMathVector(-0.5, 0, 0)})
  {
    double o1 = -1, o2 = -1, o3 = -1;
    ASSERT_TRUE(Dir(&box, &aside, d, o1) && Dir(&aside, &box, d, o2) && Dir(&aside, &box, d, o3, 0.5));
    EXPECT_TRUE(std::fabs(o1 - 9.0) < 1e-5 && std::fabs(o2 - 9.0) < 1e-5 && std::fabs(o3 - 6.25) < 1e-5)
        << o1 << o2 << o3;
  }
  // The capsule sits 1.5 above the box; its stand-in may meet the box sooner, never later.
  EXPECT_TRUE(Dir(&capsule, &box, RKMMathVector(0, 0, -1), out));
  EXPECT_LE(out, 1.5 * 1.5 + 1e-9);
}

// The reported travel is the contact itself: a little less in either sense leaves the volumes apart, a
// little more in one sense makes them meet; a miss means no travel along the line meets.
template <class Meets>
void ExpectContactAt(bool met, double out, Meets meets, const RKMMathVector &u, int &hits, int &misses)
{
  if (!met)
  {
    ++misses;
    EXPECT_EQ(out, 1e49);
    for (int step = -600; step <= 600; ++step)
      ASSERT_FALSE(meets(u, step * 0.05)) << "met at " << step * 0.05;
    return;
  }
  ++hits;
  const double t = std::sqrt(out), below = t * (1 - 1e-7) - 1e-9, above = t * (1 + 1e-7) + 1e-9;
  EXPECT_TRUE(t > 0.0 || meets(u, 0.0));
  EXPECT_FALSE(t > 0.0 && (meets(u, below) || meets(u, -below))) << "travel " << t;
  EXPECT_TRUE(t == 0.0 || meets(u, above) || meets(u, -above)) << "travel " << t;
}

TEST(RKMPolyOBBSweep, SquareDistanceMinDirIsTheContact)
{
  Rng g(602);
  int hits = 0, misses = 0;
  for (int n = 0; n < 240 && !HasFatalFailure(); ++n)
  {
    SCOPED_TRACE("seed 602, case " + std::to_string(n));
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
        [&](const RKMMathVector &v, double tau)
        { return fixed.GetBase().IsIntersecting(Moved(other.GetBase(), other.Center() + v * tau)); },
        u, hits, misses);
    const RKMPolyBoundingSphere ball(RandomPoint(g, 3), Uniform(g, 0.1, 2));
    const double r2 = ball.GetRadius() * ball.GetRadius();
    out = -1.0;
    const bool ballMet = fixed.SquareDistanceMinDir(ball.GetCenter(), ball.GetRadius(), d, out);
    ExpectContactAt(
        ballMet, out,
        [&](const RKMMathVector &v, double tau) { return fixed.SquareDistanceMin(ball.GetCenter() + v * tau) <= r2; },
        u, hits, misses);
  }
  EXPECT_GT(hits, 100);
  EXPECT_GT(misses, 50);
  // Too short a direction is refused (the output untouched) unless the sphere already overlaps.
  const RKMPolyOBB unit(kAxes, RKMMathVector(1, 1, 1), RKMMathPoint()),
      shifted(kAxes, RKMMathVector(1, 1, 1), {5, 0, 0});
  double out = -1.0;
  EXPECT_FALSE(unit.SquareDistanceMinDir(shifted, RKMMathVector(1e-4, 0, 0), out) ||
               unit.SquareDistanceMinDir({5, 0, 0}, 1.0, RKMMathVector(), out) ||
               unit.SquareDistanceMinDir({5, 0, 0}, -1.0, RKMMathVector(1, 0, 0), out) ||
               RKMPolyOBB().SquareDistanceMinDir(shifted, RKMMathVector(1, 0, 0), out));
  EXPECT_EQ(out, -1.0);
  EXPECT_TRUE(unit.SquareDistanceMinDir({1.5, 0, 0}, 1.0, RKMMathVector(), out));
  EXPECT_EQ(out, 0.0);
  ASSERT_TRUE(unit.SquareDistanceMinDir(shifted, RKMMathVector(-3, 0, 0), out));
  EXPECT_NEAR(out, 9.0, 1e-9);
  ASSERT_TRUE(unit.SquareDistanceMinDir({5, 0, 0}, 1.0, RKMMathVector(0.5, 0, 0), out));
  EXPECT_NEAR(out, 9.0, 1e-9);
}
} // namespace
