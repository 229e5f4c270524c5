#include "RKMPolyTriangleIntersector2D.h"

#include "ExactPlaneOracle.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <set>
#include <sstream>
#include <string>
#include <vector>

namespace
{
using namespace oracle;
using P = RKMMathPoint2D;

// One query as the caller sees it: the answer of the six-point entry point, checked against the
// other two entry points, which must agree point for point.
struct Reply
{
  int result = 0;
  int n = 0;
  RKMPolyIntersectionPoint pts[6];
  unsigned char sameOrientation = 0;
};

std::string Describe(const P t1[3], const P t2[3])
{
  std::ostringstream s;
  s << "t1 " << Str(t1[0]) << Str(t1[1]) << Str(t1[2]) << " t2 " << Str(t2[0]) << Str(t2[1]) << Str(t2[2]);
  return s.str();
}

std::string Describe(const Reply &r)
{
  std::ostringstream s;
  s << "result " << r.result << " [";
  for (int k = 0; k < r.n; ++k)
    s << (k ? " " : "") << Str(r.pts[k]);
  s << "]";
  return s.str();
}

// Runs the three entry points on one query; a non-empty string describes a disagreement between
// them.
std::string Query(RKMPolyTriangleIntersector2D &tri, const P t1[3], const P t2[3], Reply &r)
{
  r.result = tri.Intersect(t1[0], t1[1], t1[2], t2[0], t2[1], t2[2]);
  const RKMPolyIntersectionPoint *pts = tri.GetIntersectionPoints(r.n);
  if (r.n < 0 || r.n > 6)
    return "count out of range: " + std::to_string(r.n);
  if ((pts == nullptr) != (r.n == 0))
    return "points pointer and count disagree";
  for (int k = 0; k < r.n; ++k)
    r.pts[k] = pts[k];
  r.sameOrientation = tri.HaveSameOrientation();

  for (int entry = 0; entry < 2; ++entry)
  {
    const int res = entry == 0 ? tri.Intersect(t1, t2) : tri.IntersectInConvergence(t1, t2);
    int n = -1;
    const RKMPolyIntersectionPoint *q = tri.GetIntersectionPoints(n);
    bool same = res == r.result && n == r.n;
    for (int k = 0; same && k < n; ++k)
      same = q[k] == r.pts[k];
    if (!same)
    {
      Reply other;
      other.result = res;
      other.n = n;
      for (int k = 0; k < n && k < 6; ++k)
        other.pts[k] = q[k];
      return std::string(entry == 0 ? "Intersect(t1, t2)" : "IntersectInConvergence") + " gives " +
             Describe(other) + " against six-point " + Describe(r);
    }
  }
  return {};
}

// The expected answer of one query, from the oracle polygon of the base triangles: the features of
// each corner already renumbered for the query.
struct Expected
{
  int result = 0;
  std::vector<std::array<Feature, 2>> features; // by oracle corner, counter-clockwise
  int direction = 1;                            // +1 when the first triangle is counter-clockwise
  bool sameOrientation = false;
};

// Compares a reply with the expected polygon: same code, same corners as feature pairs and, for a
// polygon, the corners in cyclic order in the first triangle's direction.
std::string Compare(const Reply &r, const Expected &e, const std::vector<QPoint> &corners)
{
  std::ostringstream why;
  auto expectedText = [&]() {
    std::ostringstream s;
    s << "expected result " << e.result << " [";
    for (size_t k = 0; k < e.features.size(); ++k)
      s << (k ? " " : "") << Str(e.features[k][0]) << "x" << Str(e.features[k][1]) << "@" << Str(corners[k]);
    s << "] direction " << e.direction;
    return s.str();
  };
  if (r.result != e.result || r.n != static_cast<int>(e.features.size()))
  {
    why << "got " << Describe(r) << ", " << expectedText();
    return why.str();
  }
  const int m = r.n;
  std::vector<int> at(m, -1);
  std::set<int> seen;
  for (int k = 0; k < m; ++k)
  {
    const Feature f0 = Slot(r.pts[k], 0), f1 = Slot(r.pts[k], 1);
    for (int c = 0; c < m; ++c)
      if (e.features[c][0] == f0 && e.features[c][1] == f1)
        at[k] = c;
    if (at[k] < 0 || !seen.insert(at[k]).second)
    {
      why << "point " << k << " " << Str(r.pts[k]) << (at[k] < 0 ? " is no corner" : " repeated") << "; got "
          << Describe(r) << ", " << expectedText();
      return why.str();
    }
  }
  if (e.result == 3)
    for (int k = 0; k < m; ++k)
      if (at[(k + 1) % m] != ((at[k] + e.direction) % m + m) % m)
      {
        why << "corners out of order; got " << Describe(r) << ", " << expectedText();
        return why.str();
      }
  if (e.result >= 0 && r.sameOrientation != (e.sameOrientation ? 1 : 0))
  {
    why << "HaveSameOrientation " << int(r.sameOrientation);
    return why.str();
  }
  return {};
}

struct Sweep
{
  long queries = 0;
  long mismatches = 0;
  long byResult[8] = {};
};

// Pairs that meet in a point or a segment only, and the others.
enum class Contact
{
  Touching,
  Other
};

// Every vertex order of both triangles and both argument orders for one base pair of the wanted
// contact kind; returns the first mismatch.
std::string CheckPair(RKMPolyTriangleIntersector2D &tri, const P base1[3], const P base2[3], Contact kind,
                      Sweep &sweep)
{
  const QPoint q1[3] = {Q(base1[0]), Q(base1[1]), Q(base1[2])};
  const QPoint q2[3] = {Q(base2[0]), Q(base2[1]), Q(base2[2])};
  const PolygonAnswer ans = IntersectTriangles(q1, q2);
  const bool touching = ans.result == 1 || ans.result == 2;
  if (touching != (kind == Contact::Touching))
    return {};
  ++sweep.byResult[ans.result < 0 ? 4 : ans.result];
  std::vector<std::array<Feature, 2>> baseFeatures;
  for (const QPoint &c : ans.corners)
    baseFeatures.push_back({TriangleFeature(q1, c), TriangleFeature(q2, c)});
  const int orient[2] = {Orient(q1[0], q1[1], q1[2]), Orient(q2[0], q2[1], q2[2])};
  const P *bases[2] = {base1, base2};

  std::string first;
  for (int swap = 0; swap < 2; ++swap)
  {
    const int f = swap, s = 1 - swap;
    for (int p1 = 0; p1 < 6; ++p1)
      for (int p2 = 0; p2 < 6; ++p2)
      {
        const P t1[3] = {bases[f][kPerm[p1][0]], bases[f][kPerm[p1][1]], bases[f][kPerm[p1][2]]};
        const P t2[3] = {bases[s][kPerm[p2][0]], bases[s][kPerm[p2][1]], bases[s][kPerm[p2][2]]};
        Expected e;
        e.result = ans.result;
        e.direction = orient[f] * PermSign(p1);
        e.sameOrientation = orient[f] * PermSign(p1) * orient[s] * PermSign(p2) > 0;
        for (const auto &bf : baseFeatures)
          e.features.push_back({Renumber(bf[f], p1), Renumber(bf[s], p2)});
        Reply r;
        std::string why = Query(tri, t1, t2, r);
        if (why.empty())
          why = Compare(r, e, ans.corners);
        ++sweep.queries;
        if (!why.empty())
        {
          ++sweep.mismatches;
          if (first.empty())
            first = Describe(t1, t2) + ": " + why;
        }
      }
  }
  return first;
}

class TriangleSweep : public testing::TestWithParam<SweepCase>
{
};

void RunSweep(const SweepCase &c, Contact kind)
{
  RKMPolyExactArithmetic arith(c.mode);
  RKMPolyTriangleIntersector2D tri(arith);
  PointSource src(c.seed, c.layout, c.k);
  Sweep sweep;
  int reported = 0;
  const long pairs = c.count / kScale;
  for (long i = 0; i < pairs; ++i)
  {
    src.NewCase();
    P t1[3], t2[3];
    for (P &p : t1)
      p = src.Next();
    for (P &p : t2)
      p = src.Next();
    const std::string why = CheckPair(tri, t1, t2, kind, sweep);
    if (!why.empty() && reported++ < 5)
      ADD_FAILURE() << "seed " << c.seed << " pair " << i << ": " << why;
  }
  EXPECT_EQ(sweep.mismatches, 0) << "seed " << c.seed << ", " << sweep.queries << " queries";
  // The sample must exercise every kind of answer.
  if (kind == Contact::Touching)
  {
    EXPECT_GT(sweep.byResult[1], 0);
    EXPECT_GT(sweep.byResult[2], 0);
    return;
  }
  EXPECT_GT(sweep.byResult[0], 0);
  EXPECT_GT(sweep.byResult[3], 0);
  if (c.layout < Layout::Skewed)
  {
    EXPECT_GT(sweep.byResult[4], 0);
  }
}

// Random pairs of triangles from a few grid points: overlapping, nested, identical, edge-sharing and
// disjoint pairs all come up often, and some triangles are flat.
TEST_P(TriangleSweep, MatchesExactClipping)
{
  RunSweep(GetParam(), Contact::Other);
}

// Pairs whose intersection is a single point or a segment: shared vertices, a vertex on an edge,
// edges overlapping with the triangles on opposite sides.
TEST_P(TriangleSweep, TouchingPairsMatchExactClipping)
{
  RunSweep(GetParam(), Contact::Touching);
}

INSTANTIATE_TEST_SUITE_P(
    Random, TriangleSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 60000, 11},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 3, 60000, 12},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 4, 60000, 13},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 4, 60000, 14},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 3, 20000, 15},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Lattice, 4, 20000, 16},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 3, 20000, 17},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 4, 20000, 18}),
    [](const testing::TestParamInfo<SweepCase> &i) { return SweepName(i.param); });

class TriangleKnown : public testing::TestWithParam<Mode>
{
};

// Two counter-clockwise triangles, one the other's point reflection about the centre of the first:
// a hexagon whose corners are all edge crossings.
TEST_P(TriangleKnown, StarOfDavidGivesHexagon)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector2D tri(arith);
  const P t1[3] = {{0, 0}, {6, 0}, {3, 6}};
  const P t2[3] = {{6, 4}, {0, 4}, {3, -2}};
  EXPECT_EQ(tri.Intersect(t1, t2), 3);
  int n = 0;
  const RKMPolyIntersectionPoint *pts = tri.GetIntersectionPoints(n);
  ASSERT_EQ(n, 6);
  for (int k = 0; k < n; ++k)
  {
    EXPECT_EQ(pts[k].GetEntityType(0), RKMPolyIntersectionPoint::Bar) << k;
    EXPECT_EQ(pts[k].GetEntityType(1), RKMPolyIntersectionPoint::Bar) << k;
  }
  EXPECT_EQ(tri.HaveSameOrientation(), 1);
}

TEST_P(TriangleKnown, NestedTriangleGivesItsVertices)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector2D tri(arith);
  const P outer[3] = {{0, 0}, {10, 0}, {0, 10}};
  const P inner[3] = {{1, 1}, {2, 1}, {1, 2}};
  const P innerCw[3] = {{1, 1}, {1, 2}, {2, 1}};
  for (const P *in : {inner, innerCw})
  {
    // Inner triangle second: its vertices against the outer interior.
    ASSERT_EQ(tri.Intersect(outer, in), 3);
    int n = 0;
    const RKMPolyIntersectionPoint *pts = tri.GetIntersectionPoints(n);
    ASSERT_EQ(n, 3);
    std::set<int> vertices;
    for (int k = 0; k < n; ++k)
    {
      EXPECT_EQ(pts[k].GetEntityType(0), RKMPolyIntersectionPoint::Triangle);
      EXPECT_EQ(pts[k].GetEntityType(1), RKMPolyIntersectionPoint::Vertex);
      vertices.insert(pts[k].GetVertexIndex(1));
    }
    EXPECT_EQ(vertices, (std::set<int>{0, 1, 2}));

    // Inner triangle first: same points, slots exchanged, in the inner triangle's own order.
    ASSERT_EQ(tri.Intersect(in, outer), 3);
    pts = tri.GetIntersectionPoints(n);
    ASSERT_EQ(n, 3);
    for (int k = 0; k < n; ++k)
    {
      EXPECT_EQ(pts[k].GetEntityType(0), RKMPolyIntersectionPoint::Vertex);
      EXPECT_EQ(pts[k].GetEntityType(1), RKMPolyIntersectionPoint::Triangle);
      EXPECT_EQ(pts[(k + 1) % 3].GetVertexIndex(0), (pts[k].GetVertexIndex(0) + 1) % 3) << k;
    }
  }
}

TEST_P(TriangleKnown, DegenerateAndDisjoint)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector2D tri(arith);
  const P good[3] = {{0, 0}, {4, 0}, {0, 4}};
  const P flat[3] = {{0, 0}, {1, 1}, {2, 2}};
  const P far[3] = {{10, 10}, {12, 10}, {10, 12}};
  int n = -1;
  EXPECT_EQ(tri.Intersect(good, flat), -6);
  EXPECT_EQ(tri.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
  EXPECT_EQ(tri.Intersect(flat, good), -6);
  EXPECT_EQ(tri.Intersect(good, far), 0);
  EXPECT_EQ(tri.GetIntersectionPoints(n), nullptr);
  EXPECT_EQ(n, 0);
}

// Closed triangles that share a vertex meet in that point; sharing an edge from opposite sides, in
// that edge. Every vertex order of the first triangle must give the same contact.
TEST_P(TriangleKnown, SharedVertexAndSharedEdge)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector2D tri(arith);
  const P base[3] = {{0, 0}, {4, 0}, {0, 4}};
  const P corner[3] = {{4, 0}, {8, 0}, {4, 4}};
  const P across[3] = {{4, 0}, {4, 4}, {0, 4}};
  auto vertexOf = [](const P t[3], const P &x) {
    for (int v = 0; v < 3; ++v)
      if (t[v] == x)
        return v;
    return -1;
  };
  for (int p = 0; p < 6; ++p)
  {
    const P t1[3] = {base[kPerm[p][0]], base[kPerm[p][1]], base[kPerm[p][2]]};
    int n = 0;
    EXPECT_EQ(tri.Intersect(t1, corner), 1) << "order " << p;
    const RKMPolyIntersectionPoint *pts = tri.GetIntersectionPoints(n);
    if (n == 1)
    {
      EXPECT_EQ(pts[0].GetVertexIndex(0), vertexOf(t1, P(4, 0))) << "order " << p;
      EXPECT_EQ(pts[0].GetVertexIndex(1), 0) << "order " << p;
    }
    else
      ADD_FAILURE() << "order " << p << ": " << n << " points at the shared vertex";

    EXPECT_EQ(tri.Intersect(t1, across), 2) << "order " << p;
    pts = tri.GetIntersectionPoints(n);
    std::set<std::pair<int, int>> got, want{{vertexOf(t1, P(4, 0)), 0}, {vertexOf(t1, P(0, 4)), 2}};
    for (int k = 0; k < n; ++k)
      got.insert({pts[k].GetVertexIndex(0), pts[k].GetVertexIndex(1)});
    EXPECT_EQ(got, want) << "order " << p;
  }
}

// Copies carry the last answer in their own storage, and later queries on either side leave the
// other alone.
TEST_P(TriangleKnown, CopiesAreIndependent)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyTriangleIntersector2D tri(arith);
  const P t1[3] = {{0, 0}, {6, 0}, {3, 6}};
  const P t2[3] = {{6, 4}, {0, 4}, {3, -2}};
  const P a[3] = {{0, 0}, {10, 0}, {0, 10}};
  const P b[3] = {{1, 1}, {2, 1}, {1, 2}};
  ASSERT_EQ(tri.Intersect(t1, t2), 3);
  int n = 0;
  const RKMPolyIntersectionPoint *orig = tri.GetIntersectionPoints(n);
  const std::vector<RKMPolyIntersectionPoint> hexagon(orig, orig + n);

  RKMPolyTriangleIntersector2D copy(tri);
  int m = 0;
  const RKMPolyIntersectionPoint *cp = copy.GetIntersectionPoints(m);
  ASSERT_EQ(m, 6);
  EXPECT_NE(cp, orig);
  EXPECT_EQ(std::vector<RKMPolyIntersectionPoint>(cp, cp + m), hexagon);

  // The copy answers new queries by itself, and the original still holds the hexagon.
  EXPECT_EQ(copy.Intersect(a, b), 3);
  cp = copy.GetIntersectionPoints(m);
  ASSERT_EQ(m, 3);
  for (int k = 0; k < m; ++k)
    EXPECT_EQ(cp[k].GetEntityType(0), RKMPolyIntersectionPoint::Triangle) << k;
  orig = tri.GetIntersectionPoints(n);
  EXPECT_EQ(std::vector<RKMPolyIntersectionPoint>(orig, orig + n), hexagon);

  // Assignment over a used intersector, then a query on the assigned one; compare with a fresh one.
  RKMPolyTriangleIntersector2D assigned(arith);
  assigned.Intersect(a, t1);
  assigned = tri;
  assigned.Intersect(t2, t1);
  RKMPolyTriangleIntersector2D fresh(arith);
  EXPECT_EQ(fresh.Intersect(t2, t1), 3);
  int k1 = 0, k2 = 0;
  const RKMPolyIntersectionPoint *p1 = assigned.GetIntersectionPoints(k1);
  const RKMPolyIntersectionPoint *p2 = fresh.GetIntersectionPoints(k2);
  ASSERT_EQ(k1, k2);
  EXPECT_EQ(std::vector<RKMPolyIntersectionPoint>(p1, p1 + k1), std::vector<RKMPolyIntersectionPoint>(p2, p2 + k2));
  orig = tri.GetIntersectionPoints(n);
  EXPECT_EQ(std::vector<RKMPolyIntersectionPoint>(orig, orig + n), hexagon);
}

INSTANTIATE_TEST_SUITE_P(Modes, TriangleKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(ModeName(i.param)); });

} // namespace
