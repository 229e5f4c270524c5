#include "RKMPolyGeodesicSegmentIntersector.h"

#include "ExactSpaceOracle.h"
#include "IntersectSweep.h"
#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <cmath>
#include <memory>
#include <random>
#include <string>
#include <utility>

namespace
{
using namespace oracle;
using P = RKMMathPoint;
using Geo = RKMPolyGeodesicSegmentIntersector;
using space::Q3;

std::string Features(const Geo &g)
{
  Feature f[2];
  for (int i = 0; i < 2; ++i)
    f[i] = {g.GetEntityType(i), g.GetEntityType(i) == 1 ? g.GetVertexIndex(i) : 0};
  return Str(f[0]) + "x" + Str(f[1]);
}

// Random apexes and segment pairs on a few grid points, in their eight forms (SegmentForm): segments
// sharing an end or a ray from O, crossing rays, coplanar fans and segments through O all come up
// often. A segment through O decides before the other one, so those codes follow the query order; the
// features follow the segments and their ends.
using GeodesicSweep = SweepTest;
TEST_P(GeodesicSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  RKMPolyExactArithmetic arith(c.mode);
  Seen seen;
  Sweep<3>(c, space::kScale, [&](space::PointSource &src) {
    const P o = src.Next();
    P pt[4];
    for (P &p : pt)
      p = src.Next();
    const Q3 qo = space::Q(o), q[4] = {space::Q(pt[0]), space::Q(pt[1]), space::Q(pt[2]), space::Q(pt[3])};
    const int code[2] = {space::ThroughApex(qo, q[0], q[1]), space::ThroughApex(qo, q[2], q[3])};
    const space::ApexAnswer base = space::IntersectFromApex(qo, q[0], q[1], q[2], q[3]);
    seen(std::to_string(base.result));
    if (base.result == 1)
      seen(Str(base.f[0]).substr(0, 1) + "x" + Str(base.f[1]).substr(0, 1));
    Geo inter(arith, o);
    for (int form = 0; form < 8; ++form)
    {
      const std::array<int, 4> i = SegmentForm(form);
      const bool swap = form & 1, flip[2] = {(form & 2) != 0, (form & 4) != 0};
      space::ApexAnswer e = base;
      if (code[swap] || code[!swap])
        e.result = code[swap] ? code[swap] : code[!swap];
      if (swap)
        std::swap(e.f[0], e.f[1]);
      for (int k = 0; k < 2; ++k)
        if (flip[k] && e.f[k].type == 1)
          e.f[k].index = 1 - e.f[k].index;
      const int got = inter.Intersect(pt[i[0]], pt[i[1]], pt[i[2]], pt[i[3]]);
      std::string why;
      if (got != e.result)
        why = "got " + std::to_string(got) + ", expected " + std::to_string(e.result);
      else if (got >= 0 && inter.AreSegmentsColinear() != e.coplanar)
        why = "AreSegmentsColinear " + std::to_string(inter.AreSegmentsColinear());
      else if (got == 1 && Features(inter) != Str(e.f[0]) + "x" + Str(e.f[1]))
        why = "features " + Features(inter) + ", expected " + Str(e.f[0]) + "x" + Str(e.f[1]);
      if (!why.empty())
        return "O " + Str(o) + " ab " + Str(pt[i[0]]) + Str(pt[i[1]]) + " cd " + Str(pt[i[2]]) + Str(pt[i[3]]) +
               ": " + why;
    }
    return std::string();
  });
  seen.Expect({"0", "1"});
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
    seen.Expect({"-8", "-5", "2", "VxV", "VxB", "BxV", "BxB"});
}
RKM_SWEEPS(GeodesicSweep,
           SweepCase{kGridded, kSmallGrid, 2, 30000, 501}, SweepCase{kAdaptive, kSmallGrid, 2, 30000, 502},
           SweepCase{kGridded, kSmallGrid, 3, 30000, 503}, SweepCase{kAdaptive, kSmallGrid, 3, 30000, 504},
           SweepCase{kGridded, kLattice, 2, 10000, 505}, SweepCase{kAdaptive, kSkewed, 2, 10000, 507},
           SweepCase{kAdaptive, kExtreme, 2, 10000, 508});

// Points on the rays, inside, outside, behind O and on the lines of the rays, in the plane of the
// sector, with the rays either way round; and flat sectors, which contain nothing.
using GeodesicSectorSweep = SweepTest;
TEST_P(GeodesicSectorSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  RKMPolyExactArithmetic arith(c.mode);
  Seen seen;
  Sweep<3>(c, space::kScale, [&](space::PointSource &src) {
    const P o = src.Next(), a = src.Next(), b = src.Next();
    const Q3 qo = space::Q(o), qa = space::Q(a), qb = space::Q(b);
    const bool flat = space::Collinear(qo, qa, qb);
    Geo inter(arith, o);
    // Integer combinations keep p exactly in the plane and often on a ray or its extension.
    std::uniform_int_distribution<int> w(-2, 2);
    for (int j = 0; j < 6; ++j)
    {
      const double u = w(src.Rng()), v = w(src.Rng());
      const P p(o.x + u * (a.x - o.x) + v * (b.x - o.x), o.y + u * (a.y - o.y) + v * (b.y - o.y),
                o.z + u * (a.z - o.z) + v * (b.z - o.z));
      const Q3 qp = space::Q(p);
      // Rounding may leave the plane (skewed data), and O itself has no direction.
      if (qp == qo || (!flat && space::Orient(qo, qa, qb, qp) != 0))
        continue;
      const bool want = !flat && space::InSector(qo, qa, qb, qp);
      seen(flat ? "flat" : want ? "inside" : "outside");
      if (inter.IsPointWithinSector(a, b, p) != want || inter.IsPointWithinSector(b, a, p) != want)
        return "O " + Str(o) + " a " + Str(a) + " b " + Str(b) + " p " + Str(p) + ": expected " + std::to_string(want);
    }
    return std::string();
  });
  seen.Expect({"inside", "outside"});
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
    seen.Expect({"flat"});
}
RKM_SWEEPS(GeodesicSectorSweep,
           SweepCase{kGridded, kSmallGrid, 2, 20000, 511}, SweepCase{kAdaptive, kSmallGrid, 3, 20000, 512},
           SweepCase{kGridded, kLattice, 2, 10000, 513}, SweepCase{kAdaptive, kSkewed, 2, 10000, 514});

// From O at the origin, against ab in z = 0: crossing; cd starting on the ray towards a, either way
// round; directions apart; overlapping sectors, sectors sharing a ray or only O in the same plane; a
// segment on a line through O, beside O, across it or ending at it, either segment, or a single point.
// Around O = (1, 1, 1): points on the rays and inside the sector, or outside; flat sectors hold
// nothing.
TEST(Geodesic, KnownCases)
{
  const P o(0, 0, 0), a(4, 0, 0), b(0, 4, 0), o1(1, 1, 1), a1(5, 1, 1), b1(1, 5, 1);
  const struct
  {
    P a, b, c, d;
    int result;
    const char *features; // for a result of 1
    int colinear;         // -1: not looked at
  } cases[] = {{a, b, P(1, 1, -2), P(1, 1, 2), 1, "B0xB0", 0},   {a, b, P(2, 0, 0), P(0, 0, 3), 1, "V0xV0", -1},
               {b, a, P(0, 0, 3), P(2, 0, 0), 1, "V1xV1", -1},   {a, b, P(-1, -1, 1), P(-1, -2, 3), 0, "", -1},
               {a, b, P(0, 0, 1), P(-1, 0, 1), 0, "", -1},       {a, b, P(1, 3, 0), P(3, 1, 0), 2, "", 1},
               {a, b, P(4, 0, 0), P(0, -4, 0), 1, "V0xV0", 1},   {a, b, P(-4, 0, 0), P(0, -4, 0), 0, "", -1},
               {P(1, 1, 1), P(2, 2, 2), a, b, -5, "", -1},       {P(-1, -1, -1), P(2, 2, 2), a, b, -8, "", -1},
               {o, P(2, 2, 2), a, b, -5, "", -1},                {a, b, P(1, 2, 3), P(2, 4, 6), -5, "", -1},
               {a, b, P(1, 2, 3), P(-2, -4, -6), -8, "", -1},    {a, b, P(1, 2, 3), P(1, 2, 3), -5, "", -1}};
  const struct
  {
    P a, b, p;
    int inside;
  } sectors[] = {{a1, b1, P(2, 2, 1), 1},  {b1, a1, P(2, 2, 1), 1},        {a1, b1, P(9, 1, 1), 1},
                 {a1, b1, P(1, 2, 1), 1},  {a1, b1, P(0, 2, 1), 0},        {a1, b1, P(0, 1, 1), 0},
                 {a1, b1, P(0, 0, 1), 0},  {a1, b1, P(3, -1, 1), 0},       {a1, P(3, 1, 1), P(4, 1, 1), 0},
                 {a1, a1, P(2, 2, 1), 0},  {a1, P(-3, 1, 1), P(4, 1, 1), 0}, {o1, b1, P(1, 2, 1), 0}};
  for (Mode m : kModes)
  {
    RKMPolyExactArithmetic arith(m);
    Geo inter(arith, o), around(arith, o1);
    for (const auto &k : cases)
    {
      const std::string what = std::string(ModeName(m)) + " ab " + Str(k.a) + Str(k.b) + " cd " + Str(k.c) + Str(k.d);
      EXPECT_EQ(inter.Intersect(k.a, k.b, k.c, k.d), k.result) << what;
      EXPECT_TRUE(k.result != 1 || Features(inter) == k.features) << what << ": " << Features(inter);
      EXPECT_TRUE(k.colinear < 0 || inter.AreSegmentsColinear() == k.colinear) << what;
    }
    EXPECT_EQ(inter.GetEntityType(2), -1);
    EXPECT_EQ(inter.GetVertexIndex(-1), -1);
    for (const auto &s : sectors)
      EXPECT_EQ(around.IsPointWithinSector(s.a, s.b, s.p), s.inside) << ModeName(m) << Str(s.a) << Str(s.b) << Str(s.p);
    CheckCopies([&] { return std::make_unique<Geo>(arith, o); },
                [&](Geo &x) { return x.Intersect(a, b, P(4, 0, 0), P(0, -4, 0)); },
                [&](Geo &x) { return x.Intersect(a, b, P(1, 1, -2), P(1, 1, 2)); },
                [](const Geo &x) { return Features(x) + " colinear " + std::to_string(x.AreSegmentsColinear()); });
  }
}

// Where doubles fail the Adaptive mode is exact: a coplanar fan with tiny coordinates, and a fan in the
// plane x = 0 whose first sector's normal, (-1, 0, 0), rounds to zero in doubles.
TEST(Geodesic, TinyAndSliverFansAreNotRefused)
{
  RKMPolyExactArithmetic arith(kAdaptive);
  const double s = std::ldexp(1.0, -540), t = std::ldexp(1.0, 27);
  const P o(0, 0, 0), a(0, t + 1, t), b(0, t, t - 1);
  Geo inter(arith, o);
  EXPECT_EQ(inter.Intersect(P(4 * s, 0, 0), P(0, 4 * s, 0), P(s, 3 * s, 0), P(3 * s, s, 0)), 2);
  EXPECT_EQ(inter.IsPointWithinSector(P(4 * s, 0, 0), P(0, 4 * s, 0), P(s, s, 0)), 1);
  EXPECT_EQ(inter.Intersect(a, b, a, b), 2);
  EXPECT_EQ(inter.AreSegmentsColinear(), 1);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(0, 2 * t + 1, 2 * t - 1)), 1);
}

} // namespace
