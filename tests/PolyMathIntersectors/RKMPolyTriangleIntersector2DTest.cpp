#include "RKMPolyTriangleIntersector2D.h"

#include "IntersectSweep.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

namespace
{
using namespace oracle;
using P = RKMMathPoint2D;
using Inter = RKMPolyTriangleIntersector2D;

// Random pairs of triangles from a few grid points, every vertex order of both and both argument
// orders, against exact clipping: the same code, the corners as feature pairs (a polygon's in cyclic
// order along the first triangle's direction), the orientations compared, and the three entry points
// agreeing point for point. The pairs that touch in a point or a segment (shared vertices, a vertex on
// an edge, edges overlapping from opposite sides) and the others (overlapping, nested, identical,
// disjoint, flat) are checked by two tests.
void RunSweep(const SweepCase &c, bool touching)
{
  RKMPolyExactArithmetic arith(c.mode);
  Inter tri(arith);
  Seen seen;
  Sweep<2>(c, kScale, [&](PointSource &src) {
    P b1[3], b2[3];
    for (P &p : b1)
      p = src.Next();
    for (P &p : b2)
      p = src.Next();
    const QPoint q1[3] = {Q(b1[0]), Q(b1[1]), Q(b1[2])}, q2[3] = {Q(b2[0]), Q(b2[1]), Q(b2[2])};
    const PolygonAnswer ans = IntersectTriangles(q1, q2);
    if ((ans.result == 1 || ans.result == 2) != touching)
      return std::string();
    seen(std::to_string(ans.result));
    return ForEachView(b1, b2, kAllOrders, [&](const P *t1, const P *t2, const View &v) {
      const int got = tri.Intersect(t1[0], t1[1], t1[2], t2[0], t2[1], t2[2]);
      const Pairs pts = Read(tri);
      const bool same = tri.HaveSameOrientation();
      if (tri.Intersect(t1, t2) != got || Read(tri) != pts)
        return "Intersect(t1, t2) gives " + Str(Read(tri)) + ", the six-point entry " + Str(pts);
      if (tri.IntersectInConvergence(t1, t2) != got || Read(tri) != pts)
        return "IntersectInConvergence gives " + Str(Read(tri)) + ", the six-point entry " + Str(pts);
      if (got != ans.result)
        return "result " + std::to_string(got) + ", expected " + std::to_string(ans.result);
      if (got >= 0 && same != v.SameOrientation(ans.orient))
        return std::string("HaveSameOrientation ") + (same ? "1" : "0");
      return Match(pts, v.Of(ans.features), got == 3 ? Order::Cyclic : Order::Any, v.Direction(ans.orient));
    });
  });
  if (touching)
    seen.Expect({"1", "2"});
  else
    seen.Expect({"0", "3"});
  if (!touching && c.layout < Layout::Skewed)
    seen.Expect({"-6"});
}

using TriangleSweep = SweepTest;
TEST_P(TriangleSweep, MatchesExactClipping)
{
  RunSweep(GetParam(), false);
}
TEST_P(TriangleSweep, TouchingPairsMatchExactClipping)
{
  RunSweep(GetParam(), true);
}
RKM_SWEEPS(TriangleSweep,
           SweepCase{kGridded, kSmallGrid, 3, 60000, 11}, SweepCase{kAdaptive, kSmallGrid, 3, 60000, 12},
           SweepCase{kGridded, kSmallGrid, 4, 60000, 13}, SweepCase{kAdaptive, kSmallGrid, 4, 60000, 14},
           SweepCase{kGridded, kLattice, 3, 20000, 15}, SweepCase{kAdaptive, kLattice, 4, 20000, 16},
           SweepCase{kAdaptive, kSkewed, 3, 20000, 17}, SweepCase{kAdaptive, kExtreme, 4, 20000, 18});

// A triangle and its point reflection make a hexagon of edge crossings; a nested triangle gives its
// vertices in its own order, either orientation, either argument order; a flat triangle is refused
// and disjoint ones are apart, with no points.
TEST(Triangle2D, KnownCases)
{
  const P star1[3] = {{0, 0}, {6, 0}, {3, 6}}, star2[3] = {{6, 4}, {0, 4}, {3, -2}};
  const P outer[3] = {{0, 0}, {10, 0}, {0, 10}}, inner[3] = {{1, 1}, {2, 1}, {1, 2}};
  const P innerCw[3] = {{1, 1}, {1, 2}, {2, 1}};
  const P flat[3] = {{0, 0}, {1, 1}, {2, 2}}, far[3] = {{10, 10}, {12, 10}, {10, 12}};
  const struct
  {
    const P *t1, *t2;
    int result;
    const char *points;
    bool same;
  } cases[] = {{star1, star2, 3, "B0xB1 B0xB2 B1xB0 B1xB2 B2xB0 B2xB1", true},
               {outer, inner, 3, "T0xV0 T0xV1 T0xV2", true},
               {outer, innerCw, 3, "T0xV0 T0xV1 T0xV2", false},
               {inner, outer, 3, "V0xT0 V1xT0 V2xT0", true},
               {innerCw, outer, 3, "V0xT0 V1xT0 V2xT0", false},
               {outer, flat, -6, "", false},
               {flat, outer, -6, "", false},
               {outer, far, 0, "", true}};
  for (Mode m : kModes)
  {
    RKMPolyExactArithmetic arith(m);
    Inter tri(arith);
    for (const auto &k : cases)
    {
      EXPECT_EQ(tri.Intersect(k.t1, k.t2), k.result) << ModeName(m) << " " << Str3(k.t1) << Str3(k.t2);
      EXPECT_EQ(Unordered(tri), k.points) << ModeName(m) << " " << Str3(k.t1) << Str3(k.t2);
      EXPECT_TRUE(k.result < 0 || tri.HaveSameOrientation() == k.same) << ModeName(m) << " " << Str3(k.t1);
    }
    CheckCopies([&] { return std::make_unique<Inter>(arith); }, [&](Inter &x) { return x.Intersect(star1, star2); },
                [&](Inter &x) { return x.Intersect(outer, inner); }, [](const Inter &x) { return Str(Read(x)); });
  }
}

} // namespace
