#include "RKMPolyTriangleSegmentIntersector2D.h"

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

// Random triangles and segments from a few grid points, every vertex order and both directions:
// segments through vertices, along edges, ending on edges, inside, outside, single points and flat
// triangles all come up often. The points are the ends of the exact overlap, from p towards q.
using TriangleSegmentSweep = SweepTest;
TEST_P(TriangleSegmentSweep, MatchesExactClipping)
{
  const SweepCase c = GetParam();
  RKMPolyExactArithmetic arith(c.mode);
  RKMPolyTriangleSegmentIntersector2D inter(arith);
  Seen seen;
  Sweep<2>(c, kScale, [&](PointSource &src) {
    P t[3];
    for (P &p : t)
      p = src.Next();
    const P bp = src.Next(), bq = src.Next();
    const QPoint qt[3] = {Q(t[0]), Q(t[1]), Q(t[2])}, qp = Q(bp), qq = Q(bq);
    const ClipAnswer ans = ClipSegment(qt, qp, qq);
    seen(std::to_string(ans.result));
    // A single point against a flat triangle may be refused either way.
    const bool either = ans.result == -5 && Orient(qt[0], qt[1], qt[2]) == 0;
    Pairs ends;
    for (const mpq_class &u : ans.t)
    {
      const QPoint x = Lerp(qp, qq, u);
      ends.push_back({TriangleFeature(qt, x), SegmentFeature(qp, qq, x)});
    }
    return ForEachSegmentView(t, bp, bq, ends, [&](const P *tv, const P &p, const P &q, const Pairs &want) {
      const int got = inter.Intersect(tv[0], tv[1], tv[2], p, q);
      if (got != ans.result && !(either && got == -6))
        return "result " + std::to_string(got) + ", expected " + std::to_string(ans.result);
      return Match(Read(inter), want, Order::Exact);
    });
  });
  seen.Expect({"0", "1", "2"});
  if (c.layout < Layout::Skewed)
    seen.Expect({"-5", "-6"});
}
RKM_SWEEPS(TriangleSegmentSweep,
           SweepCase{kGridded, kSmallGrid, 3, 150000, 21}, SweepCase{kAdaptive, kSmallGrid, 3, 150000, 22},
           SweepCase{kGridded, kSmallGrid, 4, 150000, 23}, SweepCase{kAdaptive, kSmallGrid, 4, 150000, 24},
           SweepCase{kGridded, kLattice, 3, 50000, 25}, SweepCase{kAdaptive, kLattice, 4, 50000, 26},
           SweepCase{kAdaptive, kSkewed, 3, 50000, 27}, SweepCase{kAdaptive, kExtreme, 4, 50000, 28});

// A vertical line through a right triangle enters across bar 0 and leaves across bar 1; reversed
// against the clockwise triangle it crosses bars 1 and 2. Single points and flat triangles (even with
// the segment on their line) are refused with no points.
TEST(TriangleSegment2D, KnownCases)
{
  const P a(0, 0), b(4, 0), c(0, 4), p(1, -1), q(1, 5);
  const struct
  {
    P t[3], p, q;
    int result;
    const char *points;
  } cases[] = {{{a, b, c}, p, q, 2, "B0xB0 B1xB0"},          {{a, c, b}, q, p, 2, "B1xB0 B2xB0"},
               {{a, b, c}, P(1, 1), P(2, 1), 2, "T0xV0 T0xV1"}, {{a, b, c}, P(1, 1), P(1, 1), -5, ""},
               {{a, P(1, 1), P(2, 2)}, P(0, 1), P(3, 1), -6, ""}, {{a, P(1, 1), P(2, 2)}, P(-1, -1), P(3, 3), -6, ""}};
  for (Mode m : kModes)
  {
    RKMPolyExactArithmetic arith(m);
    RKMPolyTriangleSegmentIntersector2D inter(arith);
    for (const auto &k : cases)
    {
      EXPECT_EQ(inter.Intersect(k.t[0], k.t[1], k.t[2], k.p, k.q), k.result) << ModeName(m) << " " << Str3(k.t);
      EXPECT_EQ(Str(Read(inter)), k.points) << ModeName(m) << " " << Str3(k.t);
    }
    CheckCopies([&] { return std::make_unique<RKMPolyTriangleSegmentIntersector2D>(arith); },
                [&](RKMPolyTriangleSegmentIntersector2D &x) { return x.Intersect(a, b, c, p, q); },
                [&](RKMPolyTriangleSegmentIntersector2D &x) { return x.Intersect(a, b, c, P(1, 1), P(2, 1)); },
                [](const RKMPolyTriangleSegmentIntersector2D &x) { return Str(Read(x)); });
  }
}

} // namespace
