#include "RKMPolyTriangleSegmentIntersector.h"

#include "ExactSpaceOracle.h"
#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <iostream>
#include <sstream>
#include <string>
#include <vector>

namespace
{
using oracle::Feature;
using oracle::kPerm;
using oracle::Layout;
using oracle::Mode;
using oracle::Renumber;
using oracle::SweepCase;
using space::Q3;
using P = RKMMathPoint;

std::string Describe(const P t[3], const P &p, const P &q)
{
  return "triangle " + space::Str(t) + " segment " + space::Str(p) + "->" + space::Str(q);
}

struct Counts
{
  long cases = 0;
  long queries = 0;
  long mismatches = 0;
  // Oracle answers: off the plane 0 and 1, in it 0, 1, 2, -5, and degenerate triangles.
  long offPlane[2] = {};
  long inPlane[3] = {};
  long single = 0, degenerate = 0;
  // Single points off the plane by feature type on the triangle and on the segment.
  long types[4][3] = {};
  // Refused queries that still offered points (see RefusalOffersNoPoints).
  long pointsAfterRefusal = 0;
  long coplanarLeftOut = 0;
};

std::string Summary(const Counts &c)
{
  std::ostringstream s;
  s << c.cases << " cases, " << c.queries << " queries; off the plane 0/1 " << c.offPlane[0] << "/" << c.offPlane[1]
    << ", in it 0/1/2 " << c.inPlane[0] << "/" << c.inPlane[1] << "/" << c.inPlane[2] << ", single point "
    << c.single << ", degenerate " << c.degenerate;
  if (c.pointsAfterRefusal)
    s << "; refusals with points " << c.pointsAfterRefusal;
  if (c.coplanarLeftOut)
    s << "; coplanar cases left out " << c.coplanarLeftOut;
  return s.str();
}

// Every vertex order of the triangle and both directions of the segment for one base case; returns
// the first mismatch.
std::string CheckCase(RKMPolyTriangleSegmentIntersector &inter, const P base[3], const P &bp, const P &bq,
                      Counts &counts, bool skipCoplanar)
{
  const Q3 qt[3] = {space::Q(base[0]), space::Q(base[1]), space::Q(base[2])};
  const space::SegmentAnswer ans = space::IntersectSegment(qt, space::Q(bp), space::Q(bq));
  if (skipCoplanar && ans.coplanar)
  {
    ++counts.coplanarLeftOut;
    return {};
  }
  ++counts.cases;
  if (ans.result == -6)
    ++counts.degenerate;
  else if (ans.result == -5)
    ++counts.single;
  else if (ans.coplanar)
    ++counts.inPlane[ans.result];
  else
  {
    ++counts.offPlane[ans.result];
    if (ans.result == 1)
      ++counts.types[ans.features[0][0].type][ans.features[0][1].type];
  }
  // A flat triangle and a single-point segment together may be refused either way.
  std::vector<int> accepted{ans.result};
  if (ans.result == -6 && bp == bq)
    accepted.push_back(-5);

  std::string first;
  for (int perm = 0; perm < 6; ++perm)
    for (int dir = 0; dir < 2; ++dir)
    {
      const P t[3] = {base[kPerm[perm][0]], base[kPerm[perm][1]], base[kPerm[perm][2]]};
      const P &p = dir ? bq : bp, &q = dir ? bp : bq;
      std::vector<std::array<Feature, 2>> want;
      const size_t m = ans.features.size();
      for (size_t k = 0; k < m; ++k)
      {
        std::array<Feature, 2> f = ans.features[dir ? m - 1 - k : k];
        f[0] = Renumber(f[0], perm);
        if (dir && f[1].type == 1)
          f[1].index = 1 - f[1].index;
        want.push_back(f);
      }

      const int got = inter.Intersect(t[0], t[1], t[2], p, q);
      int n = -1;
      const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
      ++counts.queries;
      const bool codeOk = std::find(accepted.begin(), accepted.end(), got) != accepted.end();
      if (codeOk && got < 0 && n != 0)
      {
        ++counts.pointsAfterRefusal;
        n = 0;
        pts = nullptr;
      }
      std::ostringstream why;
      if (!codeOk || n != (got > 0 ? static_cast<int>(want.size()) : 0) || (pts == nullptr) != (n == 0))
        why << "got " << got << " with " << n << " points, expected " << ans.result << " with "
            << (ans.result > 0 ? want.size() : 0);
      else if (got >= 0 && inter.IsCoplanar() != (ans.coplanar ? 1 : 0))
        why << "IsCoplanar " << int(inter.IsCoplanar());
      else
        for (int k = 0; k < n; ++k)
          if (oracle::Slot(pts[k], 0) != want[k][0] || oracle::Slot(pts[k], 1) != want[k][1])
          {
            why << "point " << k << " got " << oracle::Str(pts[k]) << ", expected " << oracle::Str(want[k][0]) << "x"
                << oracle::Str(want[k][1]);
            if (n == 2)
              why << " (other point got " << oracle::Str(pts[1 - k]) << ")";
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

Counts RunSweep(const SweepCase &c, bool skipCoplanar)
{
  RKMPolyExactArithmetic arith(c.mode);
  RKMPolyTriangleSegmentIntersector inter(arith);
  space::PointSource src(c.seed, c.layout, c.k);
  Counts counts;
  int reported = 0;
  for (long i = 0; i < c.count / space::kScale; ++i)
  {
    src.NewCase();
    P t[3];
    for (P &p : t)
      p = src.Next();
    const P p = src.Next(), q = src.Next();
    const std::string why = CheckCase(inter, t, p, q, counts, skipCoplanar);
    if (!why.empty() && reported++ < 5)
      ADD_FAILURE() << "seed " << c.seed << " case " << i << ": " << why;
  }
  EXPECT_EQ(counts.mismatches, 0) << "seed " << c.seed << ", " << Summary(counts);
  std::cout << "[ sweep    ] " << Summary(counts) << "\n";
  return counts;
}

class TriangleSegmentSpaceSweep : public testing::TestWithParam<SweepCase>
{
};

// Random triangles and segments from a few grid points: segments through vertices, along and across
// edges, ending on the triangle, lying in its plane, single points and flat triangles all come up
// often.
TEST_P(TriangleSegmentSpaceSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  const Counts counts = RunSweep(c, c.layout == Layout::Extreme);
  EXPECT_GT(counts.offPlane[0], 0);
  EXPECT_GT(counts.offPlane[1], 0);
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
  {
    // Every feature of the triangle against either end and the interior of the segment.
    for (int a = 1; a <= 3; ++a)
      for (int b = 1; b <= 2; ++b)
        EXPECT_GT(counts.types[a][b], 0) << "point of type " << a << " x " << b;
    for (int r = 0; r < 3; ++r)
      EXPECT_GT(counts.inPlane[r], 0) << "in the plane " << r;
    EXPECT_GT(counts.single, 0);
    EXPECT_GT(counts.degenerate, 0);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Random, TriangleSegmentSpaceSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 2, 40000, 401},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 2, 40000, 402},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 40000, 403},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 3, 40000, 404},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 2, 15000, 405},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Lattice, 3, 15000, 406},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 3, 15000, 407},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 2, 15000, 408}),
    [](const testing::TestParamInfo<SweepCase> &i) { return oracle::SweepName(i.param); });

// The Adaptive mode is exact on any doubles, segments in the triangle's plane included.
TEST(TriangleSegmentSpaceExtreme, CoplanarCasesMatchExactReference)
{
  RunSweep(SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 2, 15000, 408}, false);
}

std::string Features(const RKMPolyTriangleSegmentIntersector &inter)
{
  int n = 0;
  const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
  std::string s;
  for (int k = 0; k < n; ++k)
    s += (k ? " " : "") + oracle::Str(pts[k]);
  return s;
}

// A thin but proper triangle in the plane x = 0 whose normal, (-1, 0, 0), rounds to zero in doubles;
// the Adaptive mode is exact on these integers.
TEST(TriangleSegmentSpaceRefusals, SliverTriangleIsNotRefused)
{
  RKMPolyExactArithmetic arith(RKMPolyExactArithmetic::Adaptive);
  RKMPolyTriangleSegmentIntersector inter(arith);
  const double t = std::ldexp(1.0, 27);
  const P a(0, 0, 0), b(0, t + 1, t), c(0, t, t - 1);
  EXPECT_EQ(inter.Intersect(a, b, c, a, b), 2);
  EXPECT_EQ(inter.IsCoplanar(), 1);
  EXPECT_EQ(Features(inter), "V0xV0 V1xV1");
  // From beyond b back to a along bar 0: b is inside the segment, a its end.
  EXPECT_EQ(inter.Intersect(a, b, c, P(0, 2 * t + 2, 2 * t), a), 2);
  EXPECT_EQ(Features(inter), "V1xB0 V0xV1");
}

class TriangleSegmentSpaceKnown : public testing::TestWithParam<Mode>
{
};

TEST_P(TriangleSegmentSpaceKnown, SegmentsAcrossThePlane)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector inter(arith);
  const P a(0, 0, 0), b(4, 0, 0), c(0, 4, 0);
  // Through the interior, a vertex, an edge; ending on an edge; passing beside.
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 1, -1), P(1, 1, 1)), 1);
  EXPECT_EQ(Features(inter), "T0xB0");
  EXPECT_EQ(inter.IsCoplanar(), 0);
  EXPECT_EQ(inter.Intersect(a, b, c, P(0, 0, -1), P(0, 0, 1)), 1);
  EXPECT_EQ(Features(inter), "V0xB0");
  EXPECT_EQ(inter.Intersect(a, b, c, P(2, 2, -1), P(2, 2, 1)), 1);
  EXPECT_EQ(Features(inter), "B1xB0");
  EXPECT_EQ(inter.Intersect(a, b, c, P(2, 0, 0), P(2, 1, 3)), 1);
  EXPECT_EQ(Features(inter), "B0xV0");
  EXPECT_EQ(inter.Intersect(a, b, c, P(2, 1, 3), P(0, 3, 0)), 1);
  EXPECT_EQ(Features(inter), "B2xV1");
  EXPECT_EQ(inter.Intersect(a, b, c, P(3, 3, -1), P(3, 3, 1)), 0);
  int n = -1;
  EXPECT_EQ(inter.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  // Short of the plane, parallel to it, and a single point off it.
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 1, 2), P(1, 1, 1)), 0);
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 1, 1), P(3, 0, 1)), 0);
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 1, 1), P(1, 1, 1)), 0);
}

TEST_P(TriangleSegmentSpaceKnown, SegmentsInThePlane)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector inter(arith);
  // In the tilted plane x + y + z = 4.
  const P a(4, 0, 0), b(0, 4, 0), c(0, 0, 4);
  // From bar 0 across to bar 1 through the interior, then the same segment reversed.
  const P p(3, 1, 0), q(0, 1, 3);
  EXPECT_EQ(inter.Intersect(a, b, c, p, q), 2);
  EXPECT_EQ(inter.IsCoplanar(), 1);
  EXPECT_EQ(Features(inter), "B0xV0 B1xV1");
  EXPECT_EQ(inter.Intersect(a, b, c, q, p), 2);
  EXPECT_EQ(Features(inter), "B1xV0 B0xV1");
  // Sticking out on both sides: the crossings are interior points of the segment.
  EXPECT_EQ(inter.Intersect(a, b, c, P(4, 1, -1), P(-1, 1, 4)), 2);
  EXPECT_EQ(Features(inter), "B0xB0 B1xB0");
  // Touching a vertex from outside, and a single-point segment.
  EXPECT_EQ(inter.Intersect(a, b, c, P(5, -1, 0), P(4, 0, 0)), 1);
  EXPECT_EQ(Features(inter), "V0xV1");
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 1, 2), P(1, 1, 2)), -5);
  EXPECT_EQ(inter.Intersect(a, b, c, P(5, 0, -1), P(5, -1, 0)), 0);
  EXPECT_EQ(inter.IsCoplanar(), 1);
}

TEST_P(TriangleSegmentSpaceKnown, FlatTrianglesAreRefused)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector inter(arith);
  const P a(0, 0, 0), b(1, 1, 1), c(2, 2, 2);
  int n = -1;
  // A segment along the triangle's line, across it, away from it.
  EXPECT_EQ(inter.Intersect(a, b, c, P(-1, -1, -1), P(3, 3, 3)), -6);
  EXPECT_EQ(inter.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  EXPECT_EQ(inter.Intersect(a, b, c, P(1, 0, 1), P(1, 2, 1)), -6);
  EXPECT_EQ(inter.Intersect(a, b, c, P(5, 0, 1), P(5, 2, 1)), -6);
  EXPECT_EQ(inter.Intersect(a, a, a, P(0, 0, 0), P(1, 0, 0)), -6);
  EXPECT_EQ(inter.Intersect(c, b, a, P(-1, -1, -1), P(3, 3, 3)), -6);
}

// A refused query offers no points, whatever the query before it found.
TEST_P(TriangleSegmentSpaceKnown, RefusalOffersNoPoints)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleSegmentIntersector inter(arith);
  const P a(0, 0, 0), b(4, 0, 0), c(0, 4, 0);
  ASSERT_EQ(inter.Intersect(a, b, c, P(1, -1, 0), P(1, 5, 0)), 2);
  EXPECT_EQ(inter.Intersect(P(0, 0, 0), P(1, 1, 1), P(2, 2, 2), P(0, 0, 0), P(3, 3, 3)), -6);
  int n = -1;
  EXPECT_EQ(inter.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
}

INSTANTIATE_TEST_SUITE_P(Modes, TriangleSegmentSpaceKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(oracle::ModeName(i.param)); });

} // namespace
