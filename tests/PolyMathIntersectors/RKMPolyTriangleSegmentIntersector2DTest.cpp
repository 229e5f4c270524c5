#include "RKMPolyTriangleSegmentIntersector2D.h"

#include "ExactPlaneOracle.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <sstream>
#include <string>
#include <vector>

namespace
{
using namespace oracle;
using P = RKMMathPoint2D;

struct Counts
{
  long queries = 0;
  long mismatches = 0;
  long byResult[7] = {}; // 0, 1, 2, then -5 at 5 and -6 at 6
};

std::string Describe(const P t[3], const P &p, const P &q)
{
  std::ostringstream s;
  s << "triangle " << Str(t[0]) << Str(t[1]) << Str(t[2]) << " segment " << Str(p) << "->" << Str(q);
  return s.str();
}

// Every vertex order of the triangle and both directions of the segment for one base case; returns
// the first mismatch.
std::string CheckCase(RKMPolyTriangleSegmentIntersector2D &inter, const P base[3], const P &bp, const P &bq,
                      Counts &counts)
{
  const QPoint qt[3] = {Q(base[0]), Q(base[1]), Q(base[2])};
  const QPoint qp = Q(bp), qq = Q(bq);
  const ClipAnswer ans = ClipSegment(qt, qp, qq);
  const bool bothDegenerate = ans.result == -5 && Orient(qt[0], qt[1], qt[2]) == 0;
  ++counts.byResult[ans.result == -5 ? 5 : (ans.result == -6 ? 6 : ans.result)];
  // The ends of the overlap in the base numbering, from bp towards bq.
  std::vector<std::array<Feature, 2>> ends;
  for (const mpq_class &t : ans.t)
  {
    const QPoint x = Lerp(qp, qq, t);
    ends.push_back({TriangleFeature(qt, x), SegmentFeature(qp, qq, x)});
  }

  std::string first;
  for (int perm = 0; perm < 6; ++perm)
    for (int dir = 0; dir < 2; ++dir)
    {
      const P t[3] = {base[kPerm[perm][0]], base[kPerm[perm][1]], base[kPerm[perm][2]]};
      const P &p = dir ? bq : bp, &q = dir ? bp : bq;
      std::vector<std::array<Feature, 2>> want;
      for (size_t k = 0; k < ends.size(); ++k)
      {
        std::array<Feature, 2> f = ends[dir ? ends.size() - 1 - k : k];
        f[0] = Renumber(f[0], perm);
        if (dir && f[1].type == 1)
          f[1].index = 1 - f[1].index;
        want.push_back(f);
      }

      const int got = inter.Intersect(t[0], t[1], t[2], p, q);
      int n = -1;
      const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
      ++counts.queries;
      std::ostringstream why;
      const bool codeOk = bothDegenerate ? (got == -5 || got == -6) : got == ans.result;
      if (!codeOk || n != static_cast<int>(want.size()) || (pts == nullptr) != (n == 0))
        why << "got " << got << " with " << n << " points, expected " << ans.result << " with " << want.size();
      else
        for (int k = 0; k < n; ++k)
          if (Slot(pts[k], 0) != want[k][0] || Slot(pts[k], 1) != want[k][1])
          {
            const mpq_class t = dir ? mpq_class(1 - ans.t[ends.size() - 1 - k]) : ans.t[k];
            why << "point " << k << " got " << Str(pts[k]) << ", expected " << Str(want[k][0]) << "x"
                << Str(want[k][1]) << " at " << Str(Lerp(Q(p), Q(q), t));
            if (n == 2)
              why << " (other point got " << Str(pts[1 - k]) << ")";
            break;
          }
      if (!why.str().empty())
      {
        ++counts.mismatches;
        if (first.empty())
          first = Describe(t, p, q) + ": " + why.str();
      }
    }
  return first;
}

class TriangleSegmentSweep : public testing::TestWithParam<SweepCase>
{
};

// Random triangles and segments from a few grid points: segments through vertices, along edges,
// ending on edges, inside, outside, single points, and flat triangles all come up often.
TEST_P(TriangleSegmentSweep, MatchesExactClipping)
{
  const SweepCase c = GetParam();
  RKMPolyExactArithmetic arith(c.mode);
  RKMPolyTriangleSegmentIntersector2D inter(arith);
  PointSource src(c.seed, c.layout, c.k);
  Counts counts;
  int reported = 0;
  for (long i = 0; i < c.count / kScale; ++i)
  {
    src.NewCase();
    P t[3];
    for (P &p : t)
      p = src.Next();
    const P p = src.Next(), q = src.Next();
    const std::string why = CheckCase(inter, t, p, q, counts);
    if (!why.empty() && reported++ < 5)
      ADD_FAILURE() << "seed " << c.seed << " case " << i << ": " << why;
  }
  EXPECT_EQ(counts.mismatches, 0) << "seed " << c.seed << ", " << counts.queries << " queries";
  for (int r : {0, 1, 2})
    EXPECT_GT(counts.byResult[r], 0) << r;
  if (c.layout < Layout::Skewed)
  {
    EXPECT_GT(counts.byResult[5], 0);
    EXPECT_GT(counts.byResult[6], 0);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Random, TriangleSegmentSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 150000, 21},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 3, 150000, 22},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 4, 150000, 23},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 4, 150000, 24},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 3, 50000, 25},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Lattice, 4, 50000, 26},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 3, 50000, 27},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 4, 50000, 28}),
    [](const testing::TestParamInfo<SweepCase> &i) { return SweepName(i.param); });

class TriangleSegmentKnown : public testing::TestWithParam<Mode>
{
};

TEST_P(TriangleSegmentKnown, VerticalLineThroughRightTriangle)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector2D inter(arith);
  const P a(0, 0), b(4, 0), c(0, 4), p(1, -1), q(1, 5);
  ASSERT_EQ(inter.Intersect(a, b, c, p, q), 2);
  int n = 0;
  const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
  ASSERT_EQ(n, 2);
  // Enters across bar 0 at (1, 0), leaves across bar 1 at (1, 3).
  EXPECT_EQ(pts[0].GetBarIndex(0), 0);
  EXPECT_EQ(pts[0].GetBarIndex(1), 0);
  EXPECT_EQ(pts[1].GetBarIndex(0), 1);
  EXPECT_EQ(pts[1].GetBarIndex(1), 0);

  // The same with the segment reversed and the triangle clockwise: bar 1 of a, c, b is c → b.
  ASSERT_EQ(inter.Intersect(a, c, b, q, p), 2);
  pts = inter.GetIntersectionPoints(n);
  ASSERT_EQ(n, 2);
  EXPECT_EQ(pts[0].GetBarIndex(0), 1);
  EXPECT_EQ(pts[1].GetBarIndex(0), 2);
}

TEST_P(TriangleSegmentKnown, DegenerateInputs)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector2D inter(arith);
  const P a(0, 0), b(4, 0), c(0, 4);
  int n = -1;
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 1), P(1, 1)), -5);
  EXPECT_EQ(inter.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  EXPECT_EQ(inter.Intersect(a, P(1, 1), P(2, 2), P(0, 1), P(3, 1)), -6);
  EXPECT_EQ(inter.GetIntersectionPoints(n), nullptr);
  // A flat triangle with the segment on its line is degenerate too, not an overlap.
  EXPECT_EQ(inter.Intersect(a, P(1, 1), P(2, 2), P(-1, -1), P(3, 3)), -6);
}

// A copy keeps the answer it was made with, whatever the original does next.
TEST_P(TriangleSegmentKnown, CopiesAreIndependent)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector2D inter(arith);
  const P a(0, 0), b(4, 0), c(0, 4);
  ASSERT_EQ(inter.Intersect(a, b, c, P(1, -1), P(1, 5)), 2);
  RKMPolyTriangleSegmentIntersector2D copy(inter);
  RKMPolyTriangleSegmentIntersector2D assigned(arith);
  assigned = inter;
  ASSERT_EQ(inter.Intersect(a, b, c, P(1, 1), P(2, 1)), 2);
  for (const RKMPolyTriangleSegmentIntersector2D *x : {&copy, &assigned})
  {
    int n = 0;
    const RKMPolyIntersectionPoint *pts = x->GetIntersectionPoints(n);
    ASSERT_EQ(n, 2);
    EXPECT_EQ(pts[0].GetBarIndex(0), 0);
    EXPECT_EQ(pts[1].GetBarIndex(0), 1);
  }
  int n = 0;
  const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
  ASSERT_EQ(n, 2);
  EXPECT_EQ(pts[0].GetEntityType(0), RKMPolyIntersectionPoint::Triangle);
  EXPECT_EQ(pts[0].GetVertexIndex(1), 0);
  EXPECT_EQ(pts[1].GetVertexIndex(1), 1);
}

INSTANTIATE_TEST_SUITE_P(Modes, TriangleSegmentKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(ModeName(i.param)); });

} // namespace
