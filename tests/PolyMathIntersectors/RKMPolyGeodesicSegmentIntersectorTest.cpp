#include "RKMPolyGeodesicSegmentIntersector.h"

#include "ExactSpaceOracle.h"
#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <cmath>
#include <utility>
#include <iostream>
#include <sstream>
#include <string>

namespace
{
using oracle::Layout;
using oracle::Mode;
using oracle::SweepCase;
using space::Q3;
using P = RKMMathPoint;

// What Intersect(a, b, c, d) must answer seen from O, with each segment's feature for a result of
// 1: {1, v} when the common ray runs towards end v, {2, 0} when it meets the segment's interior.
struct GeodesicAnswer
{
  int result = -1;
  bool coplanar = false;
  int type[2] = {0, 0};
  int vertex[2] = {0, 0};
};

// Segment ab collinear with O: -8 when O lies strictly between its ends, -5 otherwise; 0 when not
// collinear.
int CollinearCode(const Q3 &o, const Q3 &a, const Q3 &b)
{
  if (!space::Collinear(o, a, b))
    return 0;
  return a != b && space::StrictlyBetween(a, b, o) ? -8 : -5;
}

// The feature on segment ab of the ray from O through x, which lies in the sector O a b.
void RayFeature(const Q3 &o, const Q3 &a, const Q3 &b, const Q3 &x, int &type, int &vertex)
{
  const Q3 u = x - o;
  if (space::IsZero(space::Cross(u, a - o)) && sgn(space::Dot(u, a - o)) > 0)
  {
    type = 1;
    vertex = 0;
  }
  else if (space::IsZero(space::Cross(u, b - o)) && sgn(space::Dot(u, b - o)) > 0)
  {
    type = 1;
    vertex = 1;
  }
  else
  {
    type = 2;
    vertex = 0;
  }
}

GeodesicAnswer Expect(const Q3 &o, const Q3 &a, const Q3 &b, const Q3 &c, const Q3 &d)
{
  GeodesicAnswer ans;
  if (const int code = CollinearCode(o, a, b))
  {
    ans.result = code;
    return ans;
  }
  if (const int code = CollinearCode(o, c, d))
  {
    ans.result = code;
    return ans;
  }
  const Q3 t1[3] = {o, a, b}, t2[3] = {o, c, d};
  const space::SpaceAnswer tt = space::IntersectTriangles(t1, t2);
  ans.coplanar = tt.coplanar;
  const int r = tt.result;
  if (tt.coplanar)
    ans.result = r == 3 ? 2 : r == 2 ? 1 : r == 1 ? 0 : -100;
  else
    ans.result = r == 2 ? 1 : r == 1 ? 0 : -100;
  if (ans.result == 1)
  {
    // The end of the common segment other than O: on the plane it comes from the polygon corners,
    // off it from the section points.
    Q3 x;
    if (tt.coplanar)
    {
      // The corner that is not vertex 0 of both: vertex 0 is O.
      const Q3 *tri1 = t1;
      bool found = false;
      for (const auto &f : tt.features)
      {
        if (f[0].type == 1 && f[0].index == 0)
          continue;
        // Rebuild the point from its feature on the second triangle when the first one does not
        // pin it: the corner lies where the two features meet, and one of them is a vertex for a
        // touching contact along a shared ray.
        if (f[0].type == 1)
          x = tri1[f[0].index], found = true;
        else if (f[1].type == 1)
          x = t2[f[1].index], found = true;
      }
      if (!found)
        ans.result = -100;
    }
    else
      x = tt.points[0] == o ? tt.points[1] : tt.points[0];
    if (ans.result == 1)
    {
      RayFeature(o, a, b, x, ans.type[0], ans.vertex[0]);
      RayFeature(o, c, d, x, ans.type[1], ans.vertex[1]);
    }
  }
  return ans;
}

std::string Describe(const P &o, const P &a, const P &b, const P &c, const P &d)
{
  return "O " + space::Str(o) + " ab " + space::Str(a) + "-" + space::Str(b) + " cd " + space::Str(c) + "-" +
         space::Str(d);
}

struct GeoCounts
{
  long cases = 0;
  long queries = 0;
  long mismatches = 0;
  // By expected result: -8, -5, 0, 1, 2.
  long byResult[5] = {};
  long coplanar = 0;
  // Features of a result of 1: vertex or interior on each segment.
  long ends[3][3] = {};
  long coplanarLeftOut = 0;
};

int ResultSlot(int r)
{
  return r == -8 ? 0 : r == -5 ? 1 : r + 2;
}

// The answer for a variant of the base case: the segments exchanged (swap) and either segment's ends
// exchanged (flip, by query slot). A segment through O decides before the other one, so the codes
// follow the query order; features follow the segments and their ends.
GeodesicAnswer Variant(const GeodesicAnswer &base, const int code[2], bool swap, const bool flip[2])
{
  GeodesicAnswer e;
  const int first = swap ? 1 : 0;
  if (code[first] != 0 || code[1 - first] != 0)
  {
    e.result = code[first] != 0 ? code[first] : code[1 - first];
    return e;
  }
  e = base;
  if (swap)
  {
    std::swap(e.type[0], e.type[1]);
    std::swap(e.vertex[0], e.vertex[1]);
  }
  for (int i = 0; i < 2; ++i)
    if (flip[i] && e.type[i] == 1)
      e.vertex[i] = 1 - e.vertex[i];
  return e;
}

// Both orders of each segment and both orders of the segments for one base case.
std::string CheckCase(const RKMPolyExactArithmetic &arith, const P &o, const P base[4], GeoCounts &counts,
                      bool skipCoplanar)
{
  const Q3 qo = space::Q(o);
  const Q3 qb[4] = {space::Q(base[0]), space::Q(base[1]), space::Q(base[2]), space::Q(base[3])};
  const int code[2] = {CollinearCode(qo, qb[0], qb[1]), CollinearCode(qo, qb[2], qb[3])};
  const GeodesicAnswer ans = code[0] == 0 && code[1] == 0 ? Expect(qo, qb[0], qb[1], qb[2], qb[3]) : GeodesicAnswer{};
  if (skipCoplanar && ans.coplanar)
  {
    ++counts.coplanarLeftOut;
    return {};
  }
  {
    const bool noFlip[2] = {false, false};
    const GeodesicAnswer first = Variant(ans, code, false, noFlip);
    ++counts.cases;
    if (first.result >= -8 && first.result <= 2)
      ++counts.byResult[ResultSlot(first.result)];
    counts.coplanar += first.coplanar;
    if (first.result == 1)
      ++counts.ends[first.type[0]][first.type[1]];
  }
  RKMPolyGeodesicSegmentIntersector inter(arith, o);
  std::string firstWhy;
  for (int variant = 0; variant < 8; ++variant)
  {
    const bool swap = variant & 1;
    const bool flip[2] = {(variant & 2) != 0, (variant & 4) != 0};
    const int s = swap ? 2 : 0, t = 2 - s;
    const int ia = s + (flip[0] ? 1 : 0), ib = s + (flip[0] ? 0 : 1), ic = t + (flip[1] ? 1 : 0),
              id = t + (flip[1] ? 0 : 1);
    const GeodesicAnswer e = Variant(ans, code, swap, flip);
    const int got = inter.Intersect(base[ia], base[ib], base[ic], base[id]);
    ++counts.queries;
    std::ostringstream why;
    if (got != e.result)
      why << "got " << got << ", expected " << e.result;
    else if (got >= 0 && inter.AreSegmentsColinear() != (e.coplanar ? 1 : 0))
      why << "AreSegmentsColinear " << int(inter.AreSegmentsColinear()) << ", expected " << e.coplanar;
    else if (got == 1)
      for (int i = 0; i < 2; ++i)
        if (inter.GetEntityType(i) != e.type[i] || (e.type[i] == 1 && inter.GetVertexIndex(i) != e.vertex[i]))
        {
          why << "segment " << i << " feature " << inter.GetEntityType(i) << "/" << inter.GetVertexIndex(i)
              << ", expected " << e.type[i] << "/" << e.vertex[i];
          break;
        }
    if (!why.str().empty())
    {
      ++counts.mismatches;
      if (firstWhy.empty())
        firstWhy = Describe(o, base[ia], base[ib], base[ic], base[id]) + ": " + why.str();
    }
  }
  return firstWhy;
}

GeoCounts RunSweep(const SweepCase &c, bool skipCoplanar)
{
  RKMPolyExactArithmetic arith(c.mode);
  space::PointSource src(c.seed, c.layout, c.k);
  GeoCounts counts;
  int reported = 0;
  for (long i = 0; i < c.count / space::kScale; ++i)
  {
    src.NewCase();
    const P o = src.Next();
    P base[4];
    for (P &p : base)
      p = src.Next();
    const std::string why = CheckCase(arith, o, base, counts, skipCoplanar);
    if (!why.empty() && reported++ < 5)
      ADD_FAILURE() << "seed " << c.seed << " case " << i << ": " << why;
  }
  std::ostringstream s;
  s << counts.cases << " cases, " << counts.queries << " queries; -8/-5/0/1/2 " << counts.byResult[0] << "/"
    << counts.byResult[1] << "/" << counts.byResult[2] << "/" << counts.byResult[3] << "/" << counts.byResult[4]
    << ", coplanar " << counts.coplanar;
  if (counts.coplanarLeftOut)
    s << ", coplanar left out " << counts.coplanarLeftOut;
  EXPECT_EQ(counts.mismatches, 0) << "seed " << c.seed << ", " << s.str();
  std::cout << "[ sweep    ] " << s.str() << "\n";
  return counts;
}

class GeodesicSweep : public testing::TestWithParam<SweepCase>
{
};

// Random apexes and segments on a few grid points: segments sharing an end or a ray from O, crossing
// rays, coplanar fans and segments through O all come up often.
TEST_P(GeodesicSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  const GeoCounts counts = RunSweep(c, c.layout == Layout::Extreme);
  EXPECT_GT(counts.byResult[ResultSlot(0)], 0);
  EXPECT_GT(counts.byResult[ResultSlot(1)], 0);
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
  {
    for (int r : {-8, -5, 0, 1, 2})
      EXPECT_GT(counts.byResult[ResultSlot(r)], 0) << r;
    for (int a = 1; a <= 2; ++a)
      for (int b = 1; b <= 2; ++b)
        EXPECT_GT(counts.ends[a][b], 0) << "ends " << a << " x " << b;
  }
}

INSTANTIATE_TEST_SUITE_P(
    Random, GeodesicSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 2, 30000, 501},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 2, 30000, 502},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 30000, 503},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 3, 30000, 504},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 2, 10000, 505},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 2, 10000, 507},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 2, 10000, 508}),
    [](const testing::TestParamInfo<SweepCase> &i) { return oracle::SweepName(i.param); });

// p in the closed sector at O between the rays towards a and b: p − O = α(a − O) + β(b − O) with
// α, β ≥ 0, for p in the plane of O, a, b and other than O.
int InSector(const Q3 &o, const Q3 &a, const Q3 &b, const Q3 &p)
{
  const Q3 n = space::Cross(a - o, b - o);
  const int alpha = sgn(space::Dot(space::Cross(p - o, b - o), n));
  const int beta = sgn(space::Dot(space::Cross(a - o, p - o), n));
  return alpha >= 0 && beta >= 0 ? 1 : 0;
}

class GeodesicSectorSweep : public testing::TestWithParam<SweepCase>
{
};

// Points on the rays, inside, outside, behind O, and on the lines of the rays, in the plane of the
// sector; and flat sectors, which contain nothing.
TEST_P(GeodesicSectorSweep, MatchesExactReference)
{
  const SweepCase c = GetParam();
  RKMPolyExactArithmetic arith(c.mode);
  space::PointSource src(c.seed, c.layout, c.k);
  long queries = 0, mismatches = 0, inside = 0, outside = 0, flat = 0;
  int reported = 0;
  for (long i = 0; i < c.count / space::kScale; ++i)
  {
    src.NewCase();
    const P o = src.Next(), a = src.Next(), b = src.Next();
    const Q3 qo = space::Q(o), qa = space::Q(a), qb = space::Q(b);
    const bool degenerate = space::Collinear(qo, qa, qb);
    RKMPolyGeodesicSegmentIntersector inter(arith, o);
    // Integer combinations keep p exactly in the plane and often on a ray or its extension.
    std::uniform_int_distribution<int> w(-2, 2);
    for (int j = 0; j < 6; ++j)
    {
      const double u = w(src.Rng()), v = w(src.Rng());
      const P p(o.x + u * (a.x - o.x) + v * (b.x - o.x), o.y + u * (a.y - o.y) + v * (b.y - o.y),
                o.z + u * (a.z - o.z) + v * (b.z - o.z));
      const Q3 qp = space::Q(p);
      // Rounding may leave the plane (skewed data), and O itself has no direction.
      if (qp == qo || (!degenerate && space::Orient(qo, qa, qb, qp) != 0))
        continue;
      const int want = degenerate ? 0 : InSector(qo, qa, qb, qp);
      (degenerate ? flat : want ? inside : outside)++;
      for (int swap = 0; swap < 2; ++swap)
      {
        const int got = swap ? inter.IsPointWithinSector(b, a, p) : inter.IsPointWithinSector(a, b, p);
        ++queries;
        if (got != want)
        {
          ++mismatches;
          if (reported++ < 5)
            ADD_FAILURE() << "seed " << c.seed << " case " << i << ": O " << space::Str(o) << " a "
                          << space::Str(swap ? b : a) << " b " << space::Str(swap ? a : b) << " p " << space::Str(p)
                          << ": got " << got << ", expected " << want;
        }
      }
    }
  }
  EXPECT_EQ(mismatches, 0) << "seed " << c.seed << ", " << queries << " queries";
  std::cout << "[ sweep    ] " << queries << " queries; inside " << inside << ", outside " << outside << ", flat "
            << flat << "\n";
  EXPECT_GT(inside, 0);
  EXPECT_GT(outside, 0);
  if (c.layout == Layout::SmallGrid && space::kScale == 1)
  {
    EXPECT_GT(flat, 0);
  }
}

INSTANTIATE_TEST_SUITE_P(
    Random, GeodesicSectorSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 2, 20000, 511},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 3, 20000, 512},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 2, 10000, 513},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 2, 10000, 514}),
    [](const testing::TestParamInfo<SweepCase> &i) { return oracle::SweepName(i.param); });

class GeodesicKnown : public testing::TestWithParam<Mode>
{
};

TEST_P(GeodesicKnown, BasicConfigurations)
{
  RKMPolyExactArithmetic arith(GetParam());
  const P o(0, 0, 0);
  RKMPolyGeodesicSegmentIntersector inter(arith, o);
  const P a(4, 0, 0), b(0, 4, 0);

  // Crossing: the plane x = y cuts both segments inside.
  EXPECT_EQ(inter.Intersect(a, b, P(1, 1, -2), P(1, 1, 2)), 1);
  EXPECT_EQ(inter.GetEntityType(0), 2);
  EXPECT_EQ(inter.GetEntityType(1), 2);
  EXPECT_EQ(inter.AreSegmentsColinear(), 0);

  // cd starts on the ray towards a, short of a: the common ray runs towards a and towards c.
  EXPECT_EQ(inter.Intersect(a, b, P(2, 0, 0), P(0, 0, 3)), 1);
  EXPECT_EQ(inter.GetEntityType(0), 1);
  EXPECT_EQ(inter.GetVertexIndex(0), 0);
  EXPECT_EQ(inter.GetEntityType(1), 1);
  EXPECT_EQ(inter.GetVertexIndex(1), 0);
  EXPECT_EQ(inter.Intersect(b, a, P(0, 0, 3), P(2, 0, 0)), 1);
  EXPECT_EQ(inter.GetVertexIndex(0), 1);
  EXPECT_EQ(inter.GetVertexIndex(1), 1);
  EXPECT_EQ(inter.GetEntityType(2), -1);

  // Directions apart: only the apex in common.
  EXPECT_EQ(inter.Intersect(a, b, P(-1, -1, 1), P(-1, -2, 3)), 0);
  EXPECT_EQ(inter.Intersect(a, b, P(0, 0, 1), P(-1, 0, 1)), 0);

  // In the same plane: overlapping sectors, sectors sharing a ray, sectors meeting only at O.
  EXPECT_EQ(inter.Intersect(a, b, P(1, 3, 0), P(3, 1, 0)), 2);
  EXPECT_EQ(inter.AreSegmentsColinear(), 1);
  EXPECT_EQ(inter.Intersect(a, b, P(4, 0, 0), P(0, -4, 0)), 1);
  EXPECT_EQ(inter.AreSegmentsColinear(), 1);
  EXPECT_EQ(inter.GetEntityType(0), 1);
  EXPECT_EQ(inter.GetVertexIndex(0), 0);
  EXPECT_EQ(inter.GetEntityType(1), 1);
  EXPECT_EQ(inter.GetVertexIndex(1), 0);
  EXPECT_EQ(inter.Intersect(a, b, P(-4, 0, 0), P(0, -4, 0)), 0);

  // Segments on a line through O: beside it, across it, ending at it; either segment.
  EXPECT_EQ(inter.Intersect(P(1, 1, 1), P(2, 2, 2), a, b), -5);
  EXPECT_EQ(inter.Intersect(P(-1, -1, -1), P(2, 2, 2), a, b), -8);
  EXPECT_EQ(inter.Intersect(o, P(2, 2, 2), a, b), -5);
  EXPECT_EQ(inter.Intersect(a, b, P(1, 2, 3), P(2, 4, 6)), -5);
  EXPECT_EQ(inter.Intersect(a, b, P(1, 2, 3), P(-2, -4, -6)), -8);
  EXPECT_EQ(inter.Intersect(a, b, P(1, 2, 3), P(1, 2, 3)), -5);
}

TEST_P(GeodesicKnown, PointsWithinSector)
{
  RKMPolyExactArithmetic arith(GetParam());
  const P o(1, 1, 1);
  RKMPolyGeodesicSegmentIntersector inter(arith, o);
  const P a(5, 1, 1), b(1, 5, 1);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(2, 2, 1)), 1);
  EXPECT_EQ(inter.IsPointWithinSector(b, a, P(2, 2, 1)), 1);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(9, 1, 1)), 1);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(1, 2, 1)), 1);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(0, 2, 1)), 0);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(0, 1, 1)), 0);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(0, 0, 1)), 0);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(3, -1, 1)), 0);
  // A flat sector holds nothing, whatever p is.
  EXPECT_EQ(inter.IsPointWithinSector(a, P(3, 1, 1), P(4, 1, 1)), 0);
  EXPECT_EQ(inter.IsPointWithinSector(a, P(-3, 1, 1), P(4, 1, 1)), 0);
  EXPECT_EQ(inter.IsPointWithinSector(a, a, P(2, 2, 1)), 0);
  EXPECT_EQ(inter.IsPointWithinSector(o, b, P(1, 2, 1)), 0);
}

INSTANTIATE_TEST_SUITE_P(Modes, GeodesicKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(oracle::ModeName(i.param)); });

// A coplanar fan with tiny coordinates in the Adaptive mode is a fan like any other.
TEST(GeodesicExtreme, TinyCoplanarSegmentsOverlap)
{
  RKMPolyExactArithmetic arith(RKMPolyExactArithmetic::Adaptive);
  const double s = std::ldexp(1.0, -540);
  const P o(0, 0, 0);
  RKMPolyGeodesicSegmentIntersector inter(arith, o);
  EXPECT_EQ(inter.Intersect(P(4 * s, 0, 0), P(0, 4 * s, 0), P(s, 3 * s, 0), P(3 * s, s, 0)), 2);
  EXPECT_EQ(inter.IsPointWithinSector(P(4 * s, 0, 0), P(0, 4 * s, 0), P(s, s, 0)), 1);
}

// A fan in the plane x = 0 from O whose first sector's normal, (-1, 0, 0), rounds to zero in
// doubles; the Adaptive mode is exact on these integers.
TEST(GeodesicRefusals, SliverSectorIsNotRefused)
{
  RKMPolyExactArithmetic arith(RKMPolyExactArithmetic::Adaptive);
  const double t = std::ldexp(1.0, 27);
  const P o(0, 0, 0), a(0, t + 1, t), b(0, t, t - 1);
  RKMPolyGeodesicSegmentIntersector inter(arith, o);
  EXPECT_EQ(inter.Intersect(a, b, a, b), 2);
  EXPECT_EQ(inter.AreSegmentsColinear(), 1);
  EXPECT_EQ(inter.IsPointWithinSector(a, b, P(0, 2 * t + 1, 2 * t - 1)), 1);
}

} // namespace
