#include "RKMPolyTriangleSegmentIntersector.h"

#include "ExactSpaceOracle.h"
#include "IntersectSweep.h"
#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <cmath>
#include <memory>
#include <string>

namespace
{
using namespace oracle;
using P = RKMMathPoint;
using Inter = RKMPolyTriangleSegmentIntersector;

// Random triangles and segments from a few grid points, every vertex order and both directions:
// segments through vertices, along and across edges, ending on the triangle, lying in its plane, single
// points and flat triangles all come up often. A refusal offers no points.
using TriangleSegmentSpaceSweep = SweepTest;
TEST_P(TriangleSegmentSpaceSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  RKMPolyExactArithmetic arith(c.mode);
  Inter inter(arith);
  Seen seen;
  Sweep<3>(c, space::kScale, [&](space::PointSource &src) {
    P t[3];
    for (P &p : t)
      p = src.Next();
    const P bp = src.Next(), bq = src.Next();
    const space::Q3 qt[3] = {space::Q(t[0]), space::Q(t[1]), space::Q(t[2])};
    const space::SegmentAnswer ans = space::IntersectSegment(qt, space::Q(bp), space::Q(bq));
    seen((ans.coplanar ? "in the plane " : "") + std::to_string(ans.result));
    if (ans.result == 1 && !ans.coplanar)
      seen(Str(ans.features[0][0]).substr(0, 1) + "x" + Str(ans.features[0][1]).substr(0, 1));
    // A flat triangle and a single-point segment together may be refused either way.
    const bool either = ans.result == -6 && bp == bq;
    return ForEachSegmentView(t, bp, bq, ans.features, [&](const P *tv, const P &p, const P &q, const Pairs &want) {
      const int got = inter.Intersect(tv[0], tv[1], tv[2], p, q);
      if (got != ans.result && !(either && got == -5))
        return "result " + std::to_string(got) + ", expected " + std::to_string(ans.result);
      if (got >= 0 && inter.IsCoplanar() != (ans.coplanar ? 1 : 0))
        return "IsCoplanar " + std::to_string(inter.IsCoplanar());
      return Match(Read(inter), got > 0 ? want : Pairs(), Order::Exact);
    });
  });
  seen.Expect({"0", "1"});
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
    seen.Expect({"VxV", "VxB", "BxV", "BxB", "TxV", "TxB", "in the plane 0", "in the plane 1", "in the plane 2",
                 "in the plane -5", "-6"});
}
RKM_SWEEPS(TriangleSegmentSpaceSweep,
           SweepCase{kGridded, kSmallGrid, 2, 40000, 401}, SweepCase{kAdaptive, kSmallGrid, 2, 40000, 402},
           SweepCase{kGridded, kSmallGrid, 3, 40000, 403}, SweepCase{kAdaptive, kSmallGrid, 3, 40000, 404},
           SweepCase{kGridded, kLattice, 2, 15000, 405}, SweepCase{kAdaptive, kLattice, 3, 15000, 406},
           SweepCase{kAdaptive, kSkewed, 3, 15000, 407}, SweepCase{kAdaptive, kExtreme, 2, 15000, 408});

struct Known
{
  P t[3], p, q;
  int result;
  const char *points;
  int coplanar;
};

// Answers and points of fixed cases; coplanar -1 when IsCoplanar is not looked at.
void CheckKnown(Inter &inter, const Known &k, const std::string &where)
{
  EXPECT_EQ(inter.Intersect(k.t[0], k.t[1], k.t[2], k.p, k.q), k.result) << where << Str3(k.t) << Str(k.p) << Str(k.q);
  EXPECT_EQ(Str(Read(inter)), k.points) << where << Str3(k.t) << Str(k.p) << Str(k.q);
  EXPECT_TRUE(k.coplanar < 0 || inter.IsCoplanar() == k.coplanar) << where << Str3(k.t) << Str(k.p) << Str(k.q);
}

// Across the plane z = 0 through the interior, a vertex, an edge; ending on an edge; beside, short of
// the plane, parallel to it, a single point off it. In the plane x + y + z = 4 from bar 0 to bar 1 both
// ways, sticking out on both sides, touching a vertex, a single point, beside. Flat triangles are
// refused, and a refusal offers none of the points the query before it found.
TEST(TriangleSegmentSpace, KnownCases)
{
  const P a(0, 0, 0), b(4, 0, 0), c(0, 4, 0), u(4, 0, 0), v(0, 4, 0), w(0, 0, 4), f1(1, 1, 1), f2(2, 2, 2);
  const Known cases[] = {
      {{a, b, c}, P(1, 1, -1), P(1, 1, 1), 1, "T0xB0", 0}, {{a, b, c}, P(0, 0, -1), P(0, 0, 1), 1, "V0xB0", 0},
      {{a, b, c}, P(2, 2, -1), P(2, 2, 1), 1, "B1xB0", 0}, {{a, b, c}, P(2, 0, 0), P(2, 1, 3), 1, "B0xV0", 0},
      {{a, b, c}, P(2, 1, 3), P(0, 3, 0), 1, "B2xV1", 0}, {{a, b, c}, P(3, 3, -1), P(3, 3, 1), 0, "", 0},
      {{a, b, c}, P(1, 1, 2), P(1, 1, 1), 0, "", -1}, {{a, b, c}, P(1, 1, 1), P(3, 0, 1), 0, "", -1},
      {{a, b, c}, P(1, 1, 1), P(1, 1, 1), 0, "", -1}, {{u, v, w}, P(3, 1, 0), P(0, 1, 3), 2, "B0xV0 B1xV1", 1},
      {{u, v, w}, P(0, 1, 3), P(3, 1, 0), 2, "B1xV0 B0xV1", 1},
      {{u, v, w}, P(4, 1, -1), P(-1, 1, 4), 2, "B0xB0 B1xB0", 1}, {{u, v, w}, P(5, -1, 0), u, 1, "V0xV1", 1},
      {{u, v, w}, P(1, 1, 2), P(1, 1, 2), -5, "", -1}, {{u, v, w}, P(5, 0, -1), P(5, -1, 0), 0, "", 1},
      {{a, b, c}, P(1, -1, 0), P(1, 5, 0), 2, "B0xB0 B1xB0", 1}, {{a, f1, f2}, P(-1, -1, -1), P(3, 3, 3), -6, "", -1},
      {{a, f1, f2}, P(1, 0, 1), P(1, 2, 1), -6, "", -1}, {{a, f1, f2}, P(5, 0, 1), P(5, 2, 1), -6, "", -1},
      {{a, a, a}, a, P(1, 0, 0), -6, "", -1}, {{f2, f1, a}, P(-1, -1, -1), P(3, 3, 3), -6, "", -1}};
  for (Mode m : kModes)
  {
    RKMPolyExactArithmetic arith(m);
    Inter inter(arith);
    for (const Known &k : cases)
      CheckKnown(inter, k, ModeName(m));
    CheckCopies([&] { return std::make_unique<Inter>(arith); },
                [&](Inter &x) { return x.Intersect(a, b, c, P(1, -1, 0), P(1, 7, 0)); },
                [&](Inter &x) { return x.Intersect(a, b, c, P(1, 1, -1), P(1, 1, 1)); },
                [](const Inter &x) { return Str(Read(x)) + " coplanar " + std::to_string(x.IsCoplanar()); });
  }
}

// A thin but proper triangle in the plane x = 0 whose normal, (-1, 0, 0), rounds to zero in doubles;
// the Adaptive mode is exact on these integers. From beyond b back to a along bar 0, b is inside the
// segment and a its end.
TEST(TriangleSegmentSpace, SliverTriangleIsNotRefused)
{
  RKMPolyExactArithmetic arith(kAdaptive);
  Inter inter(arith);
  const double t = std::ldexp(1.0, 27);
  const P a(0, 0, 0), b(0, t + 1, t), c(0, t, t - 1);
  CheckKnown(inter, {{a, b, c}, a, b, 2, "V0xV0 V1xV1", 1}, "");
  CheckKnown(inter, {{a, b, c}, P(0, 2 * t + 2, 2 * t), a, 2, "V1xB0 V0xV1", 1}, "");
}

// Without an arithmetic every query is refused with no points, copies included; assignment carries
// the arithmetic, or its absence, along.
TEST(TriangleSegmentSpace, WithoutArithmetic)
{
  const P a(0, 0, 0), b(6, 0, 0), c(0, 6, 0);
  RKMPolyExactArithmetic arith;
  Inter none(static_cast<const RKMPolyExactArithmetic *>(nullptr)), some(arith);
  CheckKnown(none, {{a, b, c}, P(1, 1, -1), P(1, 1, 1), -1, "", 0}, "");
  CheckKnown(none, {{a, b, c}, P(1, -1, 0), P(1, 5, 0), -1, "", 0}, "");
  Inter copy(none);
  CheckKnown(copy, {{a, b, c}, P(1, 1, -1), P(1, 1, 1), -1, "", 0}, "");
  copy = some;
  CheckKnown(copy, {{a, b, c}, P(1, -1, 0), P(1, 5, 0), 2, "B0xB0 B1xV1", 1}, "");
  copy = none;
  CheckKnown(copy, {{a, b, c}, P(1, -1, 0), P(1, 5, 0), -1, "", 0}, "");
}

} // namespace
