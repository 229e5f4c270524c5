#include "RKMPolyTriangleIntersector.h"

#include "ExactSpaceOracle.h"
#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyNormalizeUtils.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <iostream>
#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace
{
using oracle::Feature;
using oracle::kPerm;
using oracle::Layout;
using oracle::Mode;
using oracle::PermSign;
using oracle::Renumber;
using oracle::SweepCase;
using space::Q3;
using P = RKMMathPoint;

std::string Describe(const P t1[3], const P t2[3])
{
  return "t1 " + space::Str(t1) + " t2 " + space::Str(t2);
}

struct Reply
{
  int result = 0;
  int n = 0;
  RKMPolyIntersectionPoint pts[6];
  unsigned char coplanar = 0;
  unsigned char sameOrientation = 0;
};

std::string Describe(const Reply &r)
{
  std::ostringstream s;
  s << "result " << r.result << " [";
  for (int k = 0; k < r.n && k < 6; ++k)
    s << (k ? " " : "") << oracle::Str(r.pts[k]);
  s << "]";
  return s.str();
}

// The six-point entry point, checked against the pointer one, which must agree point for point.
// With fivePoint, the triangles share their vertex 0 and the five-point entry point answers; the
// six-point one must then find the same points.
std::string Query(RKMPolyTriangleIntersector &tri, const P t1[3], const P t2[3], Reply &r, bool fivePoint = false)
{
  r.result = fivePoint ? tri.Intersect(t1[0], t1[1], t1[2], t2[1], t2[2])
                       : tri.Intersect(t1[0], t1[1], t1[2], t2[0], t2[1], t2[2]);
  const RKMPolyIntersectionPoint *pts = tri.GetIntersectionPoints(r.n);
  if (r.n < 0 || r.n > 6)
    return "count out of range: " + std::to_string(r.n);
  if ((pts == nullptr) != (r.n == 0))
    return "points pointer and count disagree";
  for (int k = 0; k < r.n; ++k)
    r.pts[k] = pts[k];
  r.coplanar = tri.AreTrianglesCoplanar();
  r.sameOrientation = tri.HaveSameOrientation();

  const int res = tri.Intersect(t1, t2);
  int n = -1;
  const RKMPolyIntersectionPoint *q = tri.GetIntersectionPoints(n);
  bool same = res == r.result && n == r.n;
  if (fivePoint)
  {
    // The same points, in whatever order.
    std::vector<bool> used(n > 0 ? n : 0, false);
    for (int k = 0; same && k < n; ++k)
    {
      bool found = false;
      for (int j = 0; j < n && !found; ++j)
        if (!used[j] && q[j] == r.pts[k])
          found = used[j] = true;
      same = found;
    }
  }
  else
    for (int k = 0; same && k < n; ++k)
      same = q[k] == r.pts[k];
  if (!same)
  {
    std::ostringstream s;
    s << (fivePoint ? "six-point entry point" : "Intersect(t1, t2)") << " gives result " << res << " [";
    for (int k = 0; k < n && k < 6; ++k)
      s << (k ? " " : "") << oracle::Str(q[k]);
    s << "] against " << (fivePoint ? "five-point " : "six-point ") << Describe(r);
    return s.str();
  }
  return {};
}

// What one query must answer, in the query's numbering.
struct Expected
{
  // The accepted codes: one, or -6 and 0 for a degenerate pair that is apart.
  std::vector<int> results;
  bool coplanar = false;
  std::vector<std::array<Feature, 2>> features;
  // Coplanar polygons: +1 when the oracle's counter-clockwise corners follow the first triangle's
  // vertex order.
  int direction = 1;
  bool sameOrientation = false;
};

std::string ExpectedText(const Expected &e)
{
  std::ostringstream s;
  s << "expected result";
  for (int r : e.results)
    s << " " << r;
  s << (e.coplanar ? " coplanar" : "") << " [";
  for (size_t k = 0; k < e.features.size(); ++k)
    s << (k ? " " : "") << oracle::Str(e.features[k][0]) << "x" << oracle::Str(e.features[k][1]);
  s << "]";
  return s.str();
}

// Where each returned point sits among the expected feature pairs; empty and a reason when the
// points are not the expected ones.
std::string Match(const Reply &r, const Expected &e, std::vector<int> &at)
{
  const int m = r.n;
  at.assign(m, -1);
  std::vector<bool> used(e.features.size(), false);
  for (int k = 0; k < m; ++k)
  {
    const Feature f0 = oracle::Slot(r.pts[k], 0), f1 = oracle::Slot(r.pts[k], 1);
    for (size_t c = 0; c < e.features.size() && at[k] < 0; ++c)
      if (!used[c] && e.features[c][0] == f0 && e.features[c][1] == f1)
      {
        at[k] = static_cast<int>(c);
        used[c] = true;
      }
    if (at[k] < 0)
      return "point " + std::to_string(k) + " " + oracle::Str(r.pts[k]) + " is not expected; got " + Describe(r) +
             ", " + ExpectedText(e);
  }
  return {};
}

std::string Compare(const Reply &r, const Expected &e, std::vector<int> &at)
{
  const bool codeOk = std::find(e.results.begin(), e.results.end(), r.result) != e.results.end();
  const size_t want = r.result <= 0 ? 0 : e.features.size();
  if (!codeOk || r.n != static_cast<int>(want))
    return "got " + Describe(r) + ", " + ExpectedText(e);
  if (r.result <= 0)
    return {};
  std::string why = Match(r, e, at);
  if (!why.empty())
    return why;
  if (r.coplanar != (e.coplanar ? 1 : 0))
    return "AreTrianglesCoplanar " + std::to_string(r.coplanar) + ", " + ExpectedText(e);
  if (e.coplanar && r.sameOrientation != (e.sameOrientation ? 1 : 0))
    return "HaveSameOrientation " + std::to_string(r.sameOrientation) + ", " + ExpectedText(e);
  const int m = r.n;
  if (e.coplanar && r.result == 3)
    for (int k = 0; k < m; ++k)
      if (at[(k + 1) % m] != ((at[k] + e.direction) % m + m) % m)
        return "corners out of order; got " + Describe(r) + ", " + ExpectedText(e);
  return {};
}

// Tallies of one sweep: queries, mismatches, and the kinds of answers the oracle gave, so a sweep
// can check that it met every kind.
struct Tally
{
  long pairs = 0;
  long queries = 0;
  long mismatches = 0;
  long apart = 0, point = 0, segment = 0;
  long coplanar[4] = {};
  long degenerate = 0;
  // Non-coplanar ends by feature type on the first triangle and on the second.
  long endTypes[4][4] = {};
  // The order of the two ends of a segment along n1 × n2 (caller numbering): forward, backward.
  long forward = 0, backward = 0;
  // Refused answers that still offered points (see DegenerateAnswerOffersNoPoints).
  long pointsAfterRefusal = 0;
  // Coplanar pairs left out (see ExtremeCoplanarPairs).
  long coplanarLeftOut = 0;
};

struct CheckOptions
{
  // The triangles share vertex 0 and the five-point entry point is checked, over the vertex orders
  // that keep the shared vertex first.
  bool fivePoint = false;
  // Whether a refused query (-6) must offer no points; off in the sweeps so that they keep checking
  // everything else, DegenerateAnswerOffersNoPoints holds the case.
  bool noPointsAfterRefusal = false;
  // Coplanar pairs are only counted, not queried.
  bool skipCoplanar = false;
  // Only the identity and one reversal of each triangle, for the slow builds.
  bool fewOrders = false;
};

// All vertex orders of both triangles and both argument orders for one base pair; returns the first
// mismatch.
std::string CheckPair(RKMPolyTriangleIntersector &tri, const P base1[3], const P base2[3], Tally &tally,
                      const CheckOptions &opt = {})
{
  const Q3 q1[3] = {space::Q(base1[0]), space::Q(base1[1]), space::Q(base1[2])};
  const Q3 q2[3] = {space::Q(base2[0]), space::Q(base2[1]), space::Q(base2[2])};
  const Q3 *qb[2] = {q1, q2};
  const P *bases[2] = {base1, base2};
  const space::SpaceAnswer ans = space::IntersectTriangles(q1, q2);
  if (opt.skipCoplanar && ans.coplanar)
  {
    ++tally.coplanarLeftOut;
    return {};
  }
  ++tally.pairs;
  if (ans.result == -6)
    ++tally.degenerate;
  else if (ans.coplanar)
    ++tally.coplanar[ans.result];
  else
  {
    (ans.result == 0 ? tally.apart : ans.result == 1 ? tally.point : tally.segment)++;
    for (const auto &f : ans.features)
      ++tally.endTypes[f[0].type][f[1].type];
  }
  const bool degenerate[2] = {space::Degenerate(q1), space::Degenerate(q2)};
  const Q3 normal[2] = {space::Normal(q1), space::Normal(q2)};
  // Five-point queries keep the shared vertex in front: the identity and the exchange of 1 and 2.
  // The same two serve when few orders are wanted.
  static const int kAll[6] = {0, 1, 2, 3, 4, 5}, kApexFirst[2] = {0, 3};
  const int *orders = opt.fivePoint || opt.fewOrders ? kApexFirst : kAll;
  const int nOrders = opt.fivePoint || opt.fewOrders ? 2 : 6;

  std::string first;
  for (int swap = 0; swap < 2; ++swap)
  {
    const int f = swap, s = 1 - swap;
    // A degenerate pair answers -6, or 0 when the first triangle lies strictly on one side of the
    // second one's plane: that needs no look at the first triangle's shape.
    std::vector<int> degenerateCodes{-6};
    if (!degenerate[s])
    {
      int side[3];
      for (int k = 0; k < 3; ++k)
        side[k] = space::Orient(qb[s][0], qb[s][1], qb[s][2], qb[f][k]);
      if (side[0] == side[1] && side[1] == side[2] && side[0] != 0)
        degenerateCodes.push_back(0);
    }
    for (int i1 = 0; i1 < nOrders; ++i1)
      for (int i2 = 0; i2 < nOrders; ++i2)
      {
        const int p1 = orders[i1], p2 = orders[i2];
        const P t1[3] = {bases[f][kPerm[p1][0]], bases[f][kPerm[p1][1]], bases[f][kPerm[p1][2]]};
        const P t2[3] = {bases[s][kPerm[p2][0]], bases[s][kPerm[p2][1]], bases[s][kPerm[p2][2]]};
        Expected e;
        if (ans.result == -6)
          e.results = degenerateCodes;
        else
          e.results = {ans.result};
        e.coplanar = ans.coplanar;
        e.direction = ans.orient[f] * PermSign(p1);
        e.sameOrientation = ans.orient[f] * PermSign(p1) * ans.orient[s] * PermSign(p2) > 0;
        for (const auto &bf : ans.features)
          e.features.push_back({Renumber(bf[f], p1), Renumber(bf[s], p2)});
        Reply r;
        std::vector<int> at;
        std::string why = Query(tri, t1, t2, r, opt.fivePoint);
        if (why.empty() && r.result < 0 && r.n != 0 &&
            std::find(e.results.begin(), e.results.end(), r.result) != e.results.end())
        {
          ++tally.pointsAfterRefusal;
          if (!opt.noPointsAfterRefusal)
            r.n = 0;
        }
        if (why.empty())
          why = Compare(r, e, at);
        ++tally.queries;
        if (!why.empty())
        {
          ++tally.mismatches;
          if (first.empty())
            first = Describe(t1, t2) + (opt.fivePoint ? " (five-point)" : "") + ": " + why;
          continue;
        }
        if (!ans.coplanar && r.result == 2 && e.features[0] != e.features[1])
        {
          const Q3 d = space::Cross(normal[f] * mpq_class(PermSign(p1)), normal[s] * mpq_class(PermSign(p2)));
          const int dirSign = sgn(space::Dot(d, ans.points[at[1]] - ans.points[at[0]]));
          (dirSign > 0 ? tally.forward : tally.backward)++;
        }
      }
  }
  return first;
}

std::string Summary(const Tally &t)
{
  std::ostringstream s;
  s << t.pairs << " pairs, " << t.queries << " queries; apart " << t.apart << ", point " << t.point << ", segment "
    << t.segment << ", coplanar 0/1/2/3 " << t.coplanar[0] << "/" << t.coplanar[1] << "/" << t.coplanar[2] << "/"
    << t.coplanar[3] << ", degenerate " << t.degenerate << "; segment ends along n1 x n2 forward " << t.forward
    << " backward " << t.backward;
  if (t.pointsAfterRefusal)
    s << "; refusals with points " << t.pointsAfterRefusal;
  if (t.coplanarLeftOut)
    s << "; coplanar pairs left out " << t.coplanarLeftOut;
  return s.str();
}

// Random pairs of triangles on a few grid points: shared vertices and edges, vertices on edges and
// faces, edges lying in the other plane, coplanar overlaps and flat triangles all come up often.
// With fivePoint the two triangles share their first vertex.
Tally RunSweep(const SweepCase &c, const CheckOptions &opt)
{
  RKMPolyExactArithmetic arith(c.mode);
  RKMPolyTriangleIntersector tri(arith);
  space::PointSource src(c.seed, c.layout, c.k);
  Tally tally;
  int reported = 0;
  const long pairs = c.count / space::kScale;
  for (long i = 0; i < pairs; ++i)
  {
    src.NewCase();
    P t1[3], t2[3];
    for (P &p : t1)
      p = src.Next();
    for (P &p : t2)
      p = src.Next();
    if (opt.fivePoint)
      t2[0] = t1[0];
    const std::string why = CheckPair(tri, t1, t2, tally, opt);
    if (!why.empty() && reported++ < 5)
      ADD_FAILURE() << "seed " << c.seed << " pair " << i << ": " << why;
  }
  EXPECT_EQ(tally.mismatches, 0) << "seed " << c.seed << ", " << Summary(tally);
  std::cout << "[ sweep    ] " << Summary(tally) << "\n";
  return tally;
}

class TriangleSpaceSweep : public testing::TestWithParam<SweepCase>
{
};

TEST_P(TriangleSpaceSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  CheckOptions opt;
  opt.skipCoplanar = c.layout == Layout::Extreme;
  const Tally tally = RunSweep(c, opt);
  EXPECT_GT(tally.apart, 0);
  EXPECT_GT(tally.point, 0);
  EXPECT_GT(tally.segment, 0);
  // The ends of a segment come along n1 × n2 in every sweep so far; only reported, the order is
  // free.
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
  {
    // Grid data must reach every contact: each feature type against each, every coplanar answer,
    // flat triangles.
    for (int a = 1; a <= 3; ++a)
      for (int b = 1; b <= 3; ++b)
        if (a + b < 6)
        {
          EXPECT_GT(tally.endTypes[a][b], 0) << "ends of type " << a << " x " << b;
        }
    for (int k = 0; k < 4; ++k)
      EXPECT_GT(tally.coplanar[k], 0) << "coplanar " << k;
    EXPECT_GT(tally.degenerate, 0);
  }
}

// Triangles that share their first vertex, through the five-point entry point: never apart, and
// the same points as the six-point one.
TEST_P(TriangleSpaceSweep, SharedVertexFivePointMatchesExactReference)
{
  const SweepCase c = GetParam();
  CheckOptions opt;
  opt.fivePoint = true;
  opt.skipCoplanar = c.layout == Layout::Extreme;
  const Tally tally = RunSweep(c, opt);
  EXPECT_EQ(tally.apart, 0);
  EXPECT_GT(tally.point, 0);
  EXPECT_GT(tally.segment, 0);
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
  {
    for (int k = 1; k < 4; ++k)
      EXPECT_GT(tally.coplanar[k], 0) << "coplanar " << k;
    EXPECT_GT(tally.degenerate, 0);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Random, TriangleSpaceSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 2, 8000, 301},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 2, 8000, 302},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 8000, 303},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 3, 8000, 304},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 2, 3000, 305},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Lattice, 3, 3000, 306},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 3, 3000, 307},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 2, 3000, 308}),
    [](const testing::TestParamInfo<SweepCase> &i) { return oracle::SweepName(i.param); });

// The Adaptive mode is exact on any doubles, coplanar pairs included.
TEST(TriangleSpaceExtreme, CoplanarPairsMatchExactReference)
{
  const SweepCase c{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 2, 3000, 308};
  const Tally tally = RunSweep(c, CheckOptions{});
  EXPECT_GT(tally.coplanar[3], 0);
}

// A refused query offers no points.
TEST(TriangleSpaceRefusals, DegenerateAnswerOffersNoPoints)
{
  for (Mode mode : {RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive})
  {
    RKMPolyExactArithmetic arith(mode);
    RKMPolyTriangleIntersector tri(arith);
    const P a[3] = {{0, 0, 0}, {4, 0, 0}, {0, 4, 0}}, b[3] = {{1, 1, 0}, {5, 1, 0}, {1, 5, 0}};
    const P flat[3] = {{0, 0, 0}, {1, 1, 0}, {2, 2, 0}};
    int n = -1;
    ASSERT_EQ(tri.Intersect(a, b), 3);
    EXPECT_EQ(tri.Intersect(flat, a), -6);
    EXPECT_EQ(tri.GetIntersectionPoints(n), nullptr);
    EXPECT_EQ(n, 0);
    // The same refusal on a fresh intersector offers nothing either.
    RKMPolyTriangleIntersector fresh(arith);
    EXPECT_EQ(fresh.Intersect(flat, a), -6);
    EXPECT_EQ(fresh.GetIntersectionPoints(n), nullptr);
    EXPECT_EQ(n, 0);
  }
}

// Coplanar pairs far below and far above 1 in the Adaptive mode, where the plane's normal does not
// fit in a double.
TEST(TriangleSpaceExtreme, TinyAndHugeCoplanarPairsAreNotRefused)
{
  RKMPolyExactArithmetic arith(RKMPolyExactArithmetic::Adaptive);
  RKMPolyTriangleIntersector tri(arith);
  const double s = std::ldexp(1.0, -540);
  const P a[3] = {{0, 0, 0}, {4 * s, 0, 0}, {0, 4 * s, 0}}, b[3] = {{s, s, 0}, {5 * s, s, 0}, {s, 5 * s, 0}};
  EXPECT_EQ(tri.Intersect(a, b), 3);
  EXPECT_EQ(tri.AreTrianglesCoplanar(), 1);
  const double h = std::ldexp(1.0, 520);
  const P c[3] = {{0, 0, 0}, {4 * h, 0, h}, {h, 0, 4 * h}}, d[3] = {{h, 0, h}, {5 * h, 0, 2 * h}, {2 * h, 0, 5 * h}};
  EXPECT_EQ(tri.Intersect(c, d), 3);
  EXPECT_EQ(tri.AreTrianglesCoplanar(), 1);
}

using FeaturePairs = std::multiset<std::pair<std::string, std::string>>;

FeaturePairs Points(const RKMPolyTriangleIntersector &tri)
{
  int n = 0;
  const RKMPolyIntersectionPoint *pts = tri.GetIntersectionPoints(n);
  FeaturePairs out;
  for (int k = 0; k < n; ++k)
    out.insert({oracle::Str(oracle::Slot(pts[k], 0)), oracle::Str(oracle::Slot(pts[k], 1))});
  return out;
}

// A thin but proper triangle in the plane x = 0 whose normal, (-1, 0, 0), rounds to zero in doubles:
// (2^27 + 1)(2^27 - 1) rounds to 2^54. The Adaptive mode is exact on such integers.
TEST(TriangleSpaceRefusals, SliverCoplanarPairIsNotRefused)
{
  RKMPolyExactArithmetic arith(RKMPolyExactArithmetic::Adaptive);
  RKMPolyTriangleIntersector tri(arith);
  const double t = std::ldexp(1.0, 27);
  const P sliver[3] = {{0, 0, 0}, {0, t + 1, t}, {0, t, t - 1}};
  const P beside[3] = {{0, 0, 0}, {0, t + 1, t}, {0, 0, t}};
  ASSERT_EQ(arith.Orientation3D(sliver[0], sliver[1], sliver[2], P(1, 0, 0)), -1);
  EXPECT_EQ(tri.Intersect(sliver, sliver), 3);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"V0", "V0"}, {"V1", "V1"}, {"V2", "V2"}}));
  // Sharing the edge from the other side: the answer comes when the sliver is second.
  EXPECT_EQ(tri.Intersect(beside, sliver), 2);
  EXPECT_EQ(tri.Intersect(sliver, beside), 2);
}

class TriangleSpaceKnown : public testing::TestWithParam<Mode>
{
};

// One triangle in z = 0 against triangles that pierce it, touch it, or lie beside it.
TEST_P(TriangleSpaceKnown, BasicContacts)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector tri(arith);
  const P base[3] = {{0, 0, 0}, {4, 0, 0}, {0, 4, 0}};

  // Upright in y = 1, crossing the interior from x = 0.5 to x = 1.5: both ends inside the base
  // and on the bars 0 and 2 of the upright one.
  const P upright[3] = {{1, 1, -1}, {2, 1, 1}, {0, 1, 1}};
  EXPECT_EQ(tri.Intersect(base, upright), 2);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"T0", "B0"}, {"T0", "B2"}}));
  EXPECT_EQ(tri.AreTrianglesCoplanar(), 0);
  EXPECT_EQ(tri.Intersect(upright, base), 2);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"B0", "T0"}, {"B2", "T0"}}));

  // Sharing only the origin, from below.
  const P corner[3] = {{0, 0, 0}, {-1, 0, -2}, {0, -1, -2}};
  EXPECT_EQ(tri.Intersect(base, corner), 1);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"V0", "V0"}}));
  EXPECT_EQ(tri.Intersect(base[0], base[1], base[2], corner[1], corner[2]), 1);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"V0", "V0"}}));

  // Sharing the edge on the x axis at a right angle.
  const P hinge[3] = {{4, 0, 0}, {0, 0, 0}, {0, 0, 4}};
  EXPECT_EQ(tri.Intersect(base, hinge), 2);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"V0", "V1"}, {"V1", "V0"}}));

  // A vertex resting on the interior, and on the middle of bar 1.
  const P onFace[3] = {{1, 1, 0}, {1, 2, 2}, {2, 1, 2}};
  EXPECT_EQ(tri.Intersect(base, onFace), 1);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"T0", "V0"}}));
  const P onBar[3] = {{3, 2, 3}, {2, 2, 0}, {2, 3, 3}};
  EXPECT_EQ(tri.Intersect(base, onBar), 1);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"B1", "V1"}}));

  // An edge lying in the plane inside the base, and one lying along bar 2 past its end.
  const P lying[3] = {{1, 1, 0}, {2, 1, 0}, {1, 1, 3}};
  EXPECT_EQ(tri.Intersect(base, lying), 2);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"T0", "V0"}, {"T0", "V1"}}));
  const P along[3] = {{0, 2, 0}, {0, 6, 0}, {0, 4, 2}};
  EXPECT_EQ(tri.Intersect(base, along), 2);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"B2", "V0"}, {"V2", "B0"}}));

  // Parallel planes, and a triangle crossing the plane beside the base.
  const P above[3] = {{0, 0, 1}, {4, 0, 1}, {0, 4, 1}};
  const P beside[3] = {{5, 5, -1}, {6, 5, 1}, {5, 6, 1}};
  int n = -1;
  EXPECT_EQ(tri.Intersect(base, above), 0);
  EXPECT_EQ(tri.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  EXPECT_EQ(tri.Intersect(base, beside), 0);
  EXPECT_EQ(tri.GetIntersectionPoints(n), nullptr);
}

TEST_P(TriangleSpaceKnown, CoplanarPairsGoThroughThePlane)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector tri(arith);
  // In the tilted plane x + y + z = 4.
  const P a[3] = {{4, 0, 0}, {0, 4, 0}, {0, 0, 4}};
  const P b[3] = {{2, 2, 0}, {0, 2, 2}, {2, 0, 2}};
  EXPECT_EQ(tri.Intersect(a, b), 3);
  EXPECT_EQ(tri.AreTrianglesCoplanar(), 1);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"B0", "V0"}, {"B1", "V1"}, {"B2", "V2"}}));
  EXPECT_EQ(tri.HaveSameOrientation(), 1);
  const P bReversed[3] = {b[0], b[2], b[1]};
  EXPECT_EQ(tri.Intersect(a, bReversed), 3);
  EXPECT_EQ(tri.HaveSameOrientation(), 0);

  // Touching along a shared edge from the other side, and at a vertex only.
  const P across[3] = {{4, 0, 0}, {0, 4, 0}, {4, 4, -4}};
  EXPECT_EQ(tri.Intersect(a, across), 2);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"V0", "V0"}, {"V1", "V1"}}));
  const P tip[3] = {{4, 0, 0}, {8, 0, -4}, {6, 2, -4}};
  EXPECT_EQ(tri.Intersect(a, tip), 1);
  EXPECT_EQ(Points(tri), (FeaturePairs{{"V0", "V0"}}));
  const P away[3] = {{8, 0, -4}, {6, 2, -4}, {8, 2, -6}};
  EXPECT_EQ(tri.Intersect(a, away), 0);
  EXPECT_EQ(tri.AreTrianglesCoplanar(), 1);
}

TEST_P(TriangleSpaceKnown, FlatTrianglesAreRefused)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector tri(arith);
  const P base[3] = {{0, 0, 0}, {4, 0, 0}, {0, 4, 0}};
  const P flatIn[3] = {{1, 1, 0}, {2, 2, 0}, {3, 3, 0}};
  const P flatAcross[3] = {{1, 1, -1}, {1, 1, 1}, {1, 1, 2}};
  const P flatAbove[3] = {{1, 1, 1}, {2, 2, 1}, {3, 3, 1}};
  const P point[3] = {{1, 1, 0}, {1, 1, 0}, {1, 1, 0}};
  EXPECT_EQ(tri.Intersect(base, flatIn), -6);
  EXPECT_EQ(tri.Intersect(flatIn, base), -6);
  EXPECT_EQ(tri.Intersect(base, flatAcross), -6);
  EXPECT_EQ(tri.Intersect(flatAcross, base), -6);
  EXPECT_EQ(tri.Intersect(base, flatAbove), -6);
  // A flat first triangle strictly on one side is simply apart.
  EXPECT_EQ(tri.Intersect(flatAbove, base), 0);
  EXPECT_EQ(tri.Intersect(base, point), -6);
  EXPECT_EQ(tri.Intersect(point, point), -6);
  // The five-point entry point: a flat triangle at the shared vertex.
  EXPECT_EQ(tri.Intersect(base[0], base[1], base[2], P(1, 1, 1), P(2, 2, 2)), -6);
  EXPECT_EQ(tri.Intersect(base[0], P(1, 1, 1), P(2, 2, 2), base[1], base[2]), -6);
  EXPECT_EQ(tri.Intersect(base[0], P(1, 1, 0), P(2, 2, 0), base[1], base[2]), -6);
}

INSTANTIATE_TEST_SUITE_P(Modes, TriangleSpaceKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(oracle::ModeName(i.param)); });

// Closed meshes with coordinates rounded to doubles: an icosphere and a torus, each against itself
// (neighbours share edges and vertices exactly) and against a copy turned by a few degrees and
// shifted by a fraction, so that faces cross at arbitrary angles.
struct Mesh
{
  std::vector<P> points;
  std::vector<std::array<int, 3>> faces;
};

Mesh Icosphere(int levels)
{
  const double g = (1.0 + std::sqrt(5.0)) / 2.0;
  Mesh m;
  m.points = {{-1, g, 0}, {1, g, 0}, {-1, -g, 0}, {1, -g, 0}, {0, -1, g}, {0, 1, g},
              {0, -1, -g}, {0, 1, -g}, {g, 0, -1}, {g, 0, 1}, {-g, 0, -1}, {-g, 0, 1}};
  m.faces = {{0, 11, 5}, {0, 5, 1},  {0, 1, 7},   {0, 7, 10}, {0, 10, 11}, {1, 5, 9}, {5, 11, 4},
             {11, 10, 2}, {10, 7, 6}, {7, 1, 8},  {3, 9, 4},  {3, 4, 2},   {3, 2, 6}, {3, 6, 8},
             {3, 8, 9},  {4, 9, 5},  {2, 4, 11}, {6, 2, 10}, {8, 6, 7},   {9, 8, 1}};
  auto unit = [](P p) {
    const double l = std::sqrt(p.x * p.x + p.y * p.y + p.z * p.z);
    return P(p.x / l, p.y / l, p.z / l);
  };
  for (P &p : m.points)
    p = unit(p);
  for (int l = 0; l < levels; ++l)
  {
    std::vector<std::array<int, 3>> next;
    std::vector<std::pair<std::pair<int, int>, int>> mid;
    auto middle = [&](int a, int b) {
      const std::pair<int, int> key(std::min(a, b), std::max(a, b));
      for (const auto &e : mid)
        if (e.first == key)
          return e.second;
      const P &pa = m.points[a], &pb = m.points[b];
      m.points.push_back(unit(P((pa.x + pb.x) / 2, (pa.y + pb.y) / 2, (pa.z + pb.z) / 2)));
      mid.push_back({key, static_cast<int>(m.points.size()) - 1});
      return static_cast<int>(m.points.size()) - 1;
    };
    for (const auto &f : m.faces)
    {
      const int a = middle(f[0], f[1]), b = middle(f[1], f[2]), c = middle(f[2], f[0]);
      next.push_back({f[0], a, c});
      next.push_back({f[1], b, a});
      next.push_back({f[2], c, b});
      next.push_back({a, b, c});
    }
    m.faces = next;
  }
  return m;
}

Mesh Torus(int around, int across, double R, double r)
{
  Mesh m;
  const double pi = std::acos(-1.0);
  for (int i = 0; i < around; ++i)
    for (int j = 0; j < across; ++j)
    {
      const double u = 2 * pi * i / around, v = 2 * pi * j / across;
      m.points.push_back({(R + r * std::cos(v)) * std::cos(u), (R + r * std::cos(v)) * std::sin(u), r * std::sin(v)});
    }
  for (int i = 0; i < around; ++i)
    for (int j = 0; j < across; ++j)
    {
      const int a = i * across + j, b = ((i + 1) % around) * across + j;
      const int c = ((i + 1) % around) * across + (j + 1) % across, d = i * across + (j + 1) % across;
      m.faces.push_back({a, b, c});
      m.faces.push_back({a, c, d});
    }
  return m;
}

// Turned by angle (radians) about the axis, then shifted; every coordinate rounds to a double.
Mesh Moved(const Mesh &m, P axis, double angle, P shift)
{
  const double l = std::sqrt(axis.x * axis.x + axis.y * axis.y + axis.z * axis.z);
  const double x = axis.x / l, y = axis.y / l, z = axis.z / l, c = std::cos(angle), s = std::sin(angle), t = 1 - c;
  const double r[3][3] = {{t * x * x + c, t * x * y - s * z, t * x * z + s * y},
                          {t * x * y + s * z, t * y * y + c, t * y * z - s * x},
                          {t * x * z - s * y, t * y * z + s * x, t * z * z + c}};
  Mesh out = m;
  for (P &p : out.points)
  {
    const P q = p;
    p = P(r[0][0] * q.x + r[0][1] * q.y + r[0][2] * q.z + shift.x, r[1][0] * q.x + r[1][1] * q.y + r[1][2] * q.z + shift.y,
          r[2][0] * q.x + r[2][1] * q.y + r[2][2] * q.z + shift.z);
  }
  return out;
}

bool BoxesMeet(const P a[3], const P b[3])
{
  for (int k = 0; k < 3; ++k)
  {
    const double amin = std::min({a[0][k], a[1][k], a[2][k]}), amax = std::max({a[0][k], a[1][k], a[2][k]});
    const double bmin = std::min({b[0][k], b[1][k], b[2][k]}), bmax = std::max({b[0][k], b[1][k], b[2][k]});
    if (amax < bmin || bmax < amin)
      return false;
  }
  return true;
}

// Every face of one mesh against every face of the other: pairs whose boxes meet go through the
// full check, the others must simply be apart.
void CheckMeshes(RKMPolyTriangleIntersector &tri, const Mesh &a, const Mesh &b, bool same, Tally &tally,
                 int &reported, const std::string &what)
{
  CheckOptions opt;
  opt.fewOrders = space::kScale > 1;
  for (size_t i = 0; i < a.faces.size(); ++i)
    for (size_t j = same ? i : 0; j < b.faces.size(); ++j)
    {
      const P t1[3] = {a.points[a.faces[i][0]], a.points[a.faces[i][1]], a.points[a.faces[i][2]]};
      const P t2[3] = {b.points[b.faces[j][0]], b.points[b.faces[j][1]], b.points[b.faces[j][2]]};
      std::string why;
      if (BoxesMeet(t1, t2))
        why = CheckPair(tri, t1, t2, tally, opt);
      else
      {
        ++tally.queries;
        const int r = tri.Intersect(t1, t2);
        if (r != 0)
        {
          ++tally.mismatches;
          why = Describe(t1, t2) + ": boxes apart, got " + std::to_string(r);
        }
      }
      if (!why.empty() && reported++ < 5)
        ADD_FAILURE() << what << " faces " << i << ", " << j << ": " << why;
    }
}

struct MeshCase
{
  Mode mode;
  bool torus;
};

class TriangleMeshes : public testing::TestWithParam<MeshCase>
{
};

TEST_P(TriangleMeshes, CrossingFacesMatchExactReference)
{
  const MeshCase c = GetParam();
  Mesh a = c.torus ? Torus(16, 8, 1.0, 0.4) : Icosphere(2);
  // Fewer faces where each query costs more.
  if (space::kScale > 1)
    a = c.torus ? Torus(8, 6, 1.0, 0.4) : Icosphere(1);
  Mesh b = Moved(a, P(1, 2, 3), 3.0 * std::acos(-1.0) / 180.0, P(0.13, 0.071, -0.052));

  RKMPolyExactArithmetic arith(c.mode);
  if (c.mode == RKMPolyExactArithmetic::Gridded)
  {
    // The Gridded mode is exact on grid coordinates only: snap both meshes together onto the grid
    // their common box calls for.
    std::vector<P> all = a.points;
    all.insert(all.end(), b.points.begin(), b.points.end());
    RKMMathBox box;
    RKMPolyExactArithmetic *ap = &arith;
    ASSERT_EQ(RKMPolyNormalizeUtils::NormalizePoints(all.data(), static_cast<int>(all.size()), box, ap), S_OK);
    ASSERT_EQ(ap, &arith);
    std::copy(all.begin(), all.begin() + a.points.size(), a.points.begin());
    std::copy(all.begin() + a.points.size(), all.end(), b.points.begin());
  }
  RKMPolyTriangleIntersector tri(arith);
  Tally tally;
  int reported = 0;
  CheckMeshes(tri, a, a, true, tally, reported, "mesh with itself");
  CheckMeshes(tri, b, b, true, tally, reported, "moved copy with itself");
  const long selfSegments = tally.segment;
  CheckMeshes(tri, a, b, false, tally, reported, "mesh with moved copy");
  EXPECT_EQ(tally.mismatches, 0) << Summary(tally);
  std::cout << "[ meshes   ] " << a.faces.size() << " faces each; " << Summary(tally) << "\n";
  // Each face meets itself, and its neighbours along an edge or at a vertex.
  EXPECT_GE(tally.coplanar[3], static_cast<long>(2 * a.faces.size()));
  EXPECT_GT(selfSegments, 0);
  // The copy's faces cross the original's along the curve where the surfaces meet.
  EXPECT_GT(tally.segment - selfSegments, 20);
}

INSTANTIATE_TEST_SUITE_P(Meshes, TriangleMeshes,
                         testing::Values(MeshCase{RKMPolyExactArithmetic::Adaptive, false},
                                         MeshCase{RKMPolyExactArithmetic::Adaptive, true},
                                         MeshCase{RKMPolyExactArithmetic::Gridded, false},
                                         MeshCase{RKMPolyExactArithmetic::Gridded, true}),
                         [](const testing::TestParamInfo<MeshCase> &i) {
                           return std::string(oracle::ModeName(i.param.mode)) + (i.param.torus ? "_Torus" : "_Icosphere");
                         });

} // namespace
