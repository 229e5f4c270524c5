#include "RKMPolySegmentIntersector2D.h"

#include "ExactPlaneOracle.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyIntersectionPointClosestPointConstructor2D.h"
#include "RKMPolyIntersectionPointDefaultConstructor2D.h"
#include "RKMPolyPointSegmentIntersector2D.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <sstream>
#include <string>

namespace
{
using namespace oracle;
using P = RKMMathPoint2D;
using Type = RKMPolyIntersection::Type;
using Error = RKMPolyIntersection::Error;

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();

std::string Describe(const P &a, const P &b, const P &c, const P &d)
{
  return Str(a) + "-" + Str(b) + " vs " + Str(c) + "-" + Str(d);
}

bool InBox(const P &a, const P &b, const P &x)
{
  return std::fmin(a.x, b.x) <= x.x && x.x <= std::fmax(a.x, b.x) && std::fmin(a.y, b.y) <= x.y &&
         x.y <= std::fmax(a.y, b.y);
}

double DistanceToLine(const P &x, const P &a, const P &b)
{
  const long double ux = b.x - a.x, uy = b.y - a.y, wx = x.x - a.x, wy = x.y - a.y;
  return static_cast<double>(std::fabs(ux * wy - uy * wx) / std::sqrt(ux * ux + uy * uy));
}

// Which of a, b, c, d lies closest to the other segment's line, ties to the earlier, from exact
// squared distances.
int ClosestExtremityOracle(const P &a, const P &b, const P &c, const P &d)
{
  const QPoint q[4] = {Q(a), Q(b), Q(c), Q(d)};
  int best = 0;
  mpq_class bestD;
  for (int k = 0; k < 4; ++k)
  {
    const QPoint &l0 = q[k < 2 ? 2 : 0], &l1 = q[k < 2 ? 3 : 1];
    const mpq_class ux = l1.x - l0.x, uy = l1.y - l0.y;
    const mpq_class cross = Cross(l0, l1, q[k]);
    const mpq_class dist = cross * cross / (ux * ux + uy * uy);
    if (k == 0 || dist < bestD)
    {
      best = k;
      bestD = dist;
    }
  }
  return best + 1;
}

// c strictly inside segment ab, all three on one line.
bool StrictlyInside(const QPoint &a, const QPoint &b, const QPoint &c)
{
  return OnClosedSegment(a, b, c) && !(c == a) && !(c == b);
}

// All answers of the segment intersector on one query against the oracle.
std::string CheckSegments(RKMPolySegmentIntersector2D &seg, const RKMPolyExactArithmetic &arith, Layout layout,
                          const P &a, const P &b, const P &c, const P &d, long counts[5])
{
  const CrossAnswer ans = IntersectSegments(Q(a), Q(b), Q(c), Q(d));
  ++counts[ans.result < 0 ? 3 : ans.result];
  if (ans.result == 1 && ans.f[0].type == 2 && ans.f[1].type == 2)
    ++counts[4];
  std::ostringstream why;
  Type type = RKMPolyIntersection::TypePoint;
  Error error = RKMPolyIntersection::ErrorUndetermined;
  const int plain = seg.Intersect(a, b, c, d);
  const int got = seg.Intersect(a, b, c, d, type, error);
  if (plain != got || got != ans.result)
  {
    why << "result " << plain << "/" << got << ", expected " << ans.result;
    return why.str();
  }
  static const std::pair<Type, Error> kMap[] = {
      {RKMPolyIntersection::TypeNone, RKMPolyIntersection::ErrorNone},
      {RKMPolyIntersection::TypePoint, RKMPolyIntersection::ErrorNone},
      {RKMPolyIntersection::TypeOverlap, RKMPolyIntersection::ErrorColinear}};
  const std::pair<Type, Error> want =
      got < 0 ? std::make_pair(RKMPolyIntersection::TypeUndefined, RKMPolyIntersection::ErrorDegenerate) : kMap[got];
  if (type != want.first || error != want.second)
  {
    why << "type " << type << " error " << error;
    return why.str();
  }
  if (got >= 0 && seg.AreSegmentsColinear() != (ans.colinear ? 1 : 0))
  {
    why << "AreSegmentsColinear " << int(seg.AreSegmentsColinear());
    return why.str();
  }
  for (int i = 0; i < 2; ++i)
  {
    const Feature f = got == 1 ? ans.f[i] : Feature{0, 0};
    if (seg.GetEntityType(i) != f.type || seg.GetVertexIndex(i) != (f.type == 1 ? f.index : -1))
    {
      why << "segment " << i << " feature " << seg.GetEntityType(i) << "/" << seg.GetVertexIndex(i) << ", expected "
          << Str(f);
      return why.str();
    }
  }

  P out(-12345, -12345);
  const HRESULT hr = seg.ConstructIntersection(a, b, c, d, out);
  if (got != 1)
  {
    if (hr != E_FAIL || !(out == P(-12345, -12345)))
      why << "ConstructIntersection after result " << got << " gives " << hr;
  }
  else if (hr != S_OK)
    why << "ConstructIntersection fails";
  else if (ans.f[0].type == 1 || ans.f[1].type == 1)
  {
    if (!(Q(out) == ans.x))
      why << "ConstructIntersection " << Str(out) << ", expected the shared vertex " << Str(ans.x);
  }
  else if (!InBox(a, b, out) || !InBox(c, d, out))
    why << "ConstructIntersection " << Str(out) << " outside a segment's box";
  else
  {
    const double eps = arith.GetCoordinatePrecision();
    const bool gridded = arith.GetMode() == RKMPolyExactArithmetic::Gridded;
    const double ex = ans.x.x.get_d(), ey = ans.x.y.get_d();
    const double err = std::hypot(out.x - ex, out.y - ey);
    if (layout == Layout::SmallGrid && err > (gridded ? 2 * eps : 1e-12))
      why << "ConstructIntersection " << Str(out) << " is " << err << " from " << Str(ans.x);
    // On the lattice an extremity may lie within the snapping tolerance of the other line: it is then
    // taken as the crossing, which keeps the point near both lines though not near the true crossing.
    else if (layout == Layout::Lattice && gridded &&
             (DistanceToLine(out, a, b) > 5 * eps || DistanceToLine(out, c, d) > 5 * eps))
      why << "ConstructIntersection " << Str(out) << " is off a line";
    else if (layout == Layout::Lattice && !gridded && err > 1e-9 * (1 + std::fabs(ex) + std::fabs(ey)))
      why << "ConstructIntersection " << Str(out) << " is " << err << " from " << Str(ans.x);
  }
  if (!why.str().empty())
    return why.str();

  int which = -1;
  const HRESULT ce = seg.GetClosestExtremity(a, b, c, d, which);
  if (got == 1)
  {
    // Exactly decided only when the squared distances are exact in double, as on the small grid.
    const int expect = layout == Layout::SmallGrid ? ClosestExtremityOracle(a, b, c, d) : -1;
    if (ce != S_OK || which < 1 || which > 4 || (expect > 0 && which != expect))
      why << "GetClosestExtremity " << which << ", expected " << expect;
  }
  else if (got == 2)
  {
    const QPoint q[4] = {Q(a), Q(b), Q(c), Q(d)};
    int expect = 0;
    if (StrictlyInside(q[0], q[1], q[2]))
      expect = 3;
    else if (StrictlyInside(q[0], q[1], q[3]))
      expect = 4;
    else if (StrictlyInside(q[2], q[3], q[0]))
      expect = 1;
    else if (StrictlyInside(q[2], q[3], q[1]))
      expect = 2;
    if (ce != S_OK || which != expect)
      why << "GetClosestExtremity on overlap " << which << ", expected " << expect;
  }
  else if (ce != E_FAIL)
    why << "GetClosestExtremity after result " << got << " gives " << ce;
  return why.str();
}

class SegmentSweep : public testing::TestWithParam<SweepCase>
{
};

// Random segment pairs from a few grid points, each in its eight symmetric forms (either segment
// reversed, the segments exchanged): crossings, touching ends, collinear overlaps and gaps, and
// single-point segments.
TEST_P(SegmentSweep, MatchesExactAnswer)
{
  const SweepCase sc = GetParam();
  RKMPolyExactArithmetic arith(sc.mode);
  RKMPolySegmentIntersector2D seg(arith);
  PointSource src(sc.seed, sc.layout, sc.k);
  long counts[5] = {};
  long mismatches = 0;
  for (long i = 0; i < sc.count / kScale; ++i)
  {
    src.NewCase();
    const P pt[4] = {src.Next(), src.Next(), src.Next(), src.Next()};
    for (int form = 0; form < 8; ++form)
    {
      const int s = form & 1 ? 2 : 0, r0 = form & 2 ? 1 : 0, r1 = form & 4 ? 1 : 0;
      const P &a = pt[s + r0], &b = pt[s + 1 - r0], &c = pt[2 - s + r1], &d = pt[3 - s - r1];
      const std::string why = CheckSegments(seg, arith, sc.layout, a, b, c, d, counts);
      if (!why.empty() && mismatches++ < 5)
        ADD_FAILURE() << "seed " << sc.seed << " case " << i << ": " << Describe(a, b, c, d) << ": " << why;
    }
  }
  EXPECT_EQ(mismatches, 0) << "seed " << sc.seed;
  for (int r = 0; r < 5; ++r)
  {
    if (sc.layout < Layout::Skewed || r == 0 || r == 4)
    {
      EXPECT_GT(counts[r], 0) << r;
    }
  }
}

INSTANTIATE_TEST_SUITE_P(
    Random, SegmentSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 40000, 31},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 4, 40000, 32},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 4, 40000, 33},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Lattice, 3, 40000, 34},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 3, 40000, 35},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 4, 40000, 36}),
    [](const testing::TestParamInfo<SweepCase> &i) { return SweepName(i.param); });

class SegmentKnown : public testing::TestWithParam<Mode>
{
};

TEST_P(SegmentKnown, CrossingTouchingOverlapping)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolySegmentIntersector2D seg(arith);
  Type type;
  Error error;

  EXPECT_EQ(seg.Intersect(P(0, 0), P(2, 0), P(1, -1), P(1, 1), type, error), 1);
  EXPECT_EQ(type, RKMPolyIntersection::TypePoint);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorNone);
  EXPECT_EQ(seg.GetEntityType(0), 2);
  EXPECT_EQ(seg.GetEntityType(1), 2);
  EXPECT_EQ(seg.AreSegmentsColinear(), 0);
  P out;
  ASSERT_EQ(seg.ConstructIntersection(P(0, 0), P(2, 0), P(1, -1), P(1, 1), out), S_OK);
  EXPECT_EQ(out, P(1, 0));

  EXPECT_EQ(seg.Intersect(P(0, 0), P(2, 0), P(2, 0), P(3, 0)), 1);
  EXPECT_EQ(seg.GetEntityType(0), 1);
  EXPECT_EQ(seg.GetVertexIndex(0), 1);
  EXPECT_EQ(seg.GetEntityType(1), 1);
  EXPECT_EQ(seg.GetVertexIndex(1), 0);
  ASSERT_EQ(seg.ConstructIntersection(P(0, 0), P(2, 0), P(2, 0), P(3, 0), out), S_OK);
  EXPECT_EQ(out, P(2, 0));

  EXPECT_EQ(seg.Intersect(P(0, 0), P(2, 0), P(1, 0), P(3, 0), type, error), 2);
  EXPECT_EQ(type, RKMPolyIntersection::TypeOverlap);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorColinear);
  EXPECT_EQ(seg.AreSegmentsColinear(), 1);
  EXPECT_EQ(seg.GetEntityType(0), 0);
  EXPECT_EQ(seg.GetVertexIndex(0), -1);
  EXPECT_EQ(seg.ConstructIntersection(P(0, 0), P(2, 0), P(1, 0), P(3, 0), out), E_FAIL);
  int which = -1;
  EXPECT_EQ(seg.GetClosestExtremity(P(0, 0), P(2, 0), P(1, 0), P(3, 0), which), S_OK);
  EXPECT_EQ(which, 3);
  // Identical segments: no extremity strictly inside the other.
  EXPECT_EQ(seg.Intersect(P(0, 0), P(2, 0), P(2, 0), P(0, 0)), 2);
  EXPECT_EQ(seg.GetClosestExtremity(P(0, 0), P(2, 0), P(2, 0), P(0, 0), which), S_OK);
  EXPECT_EQ(which, 0);

  EXPECT_EQ(seg.Intersect(P(0, 0), P(0, 0), P(1, 0), P(3, 0), type, error), -5);
  EXPECT_EQ(type, RKMPolyIntersection::TypeUndefined);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorDegenerate);
  EXPECT_EQ(seg.Intersect(P(0, 0), P(1, 0), P(3, 3), P(3, 3)), -5);
  EXPECT_EQ(seg.GetClosestExtremity(P(0, 0), P(1, 0), P(3, 3), P(3, 3), which), E_FAIL);

  EXPECT_EQ(seg.Intersect(P(0, 0), P(2, 0), P(3, 0), P(5, 0), type, error), 0);
  EXPECT_EQ(type, RKMPolyIntersection::TypeNone);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorNone);
}

// After a crossing, the extremity nearest the other segment's line: here d, 0.5 away from ab's line.
TEST_P(SegmentKnown, ClosestExtremityAfterCrossing)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolySegmentIntersector2D seg(arith);
  const P a(0, 0), b(4, 0), c(1, -3), d(2, 0.5);
  ASSERT_EQ(seg.Intersect(a, b, c, d), 1);
  int which = 0;
  EXPECT_EQ(seg.GetClosestExtremity(a, b, c, d, which), S_OK);
  EXPECT_EQ(which, 4);
}

// Without an arithmetic every query is undetermined.
TEST(SegmentIntersector, NullArithmeticIsUndetermined)
{
  RKMPolySegmentIntersector2D seg(static_cast<const RKMPolyExactArithmetic *>(nullptr));
  Type type;
  Error error;
  EXPECT_EQ(seg.Intersect(P(0, 0), P(2, 0), P(1, -1), P(1, 1), type, error), -1);
  EXPECT_EQ(type, RKMPolyIntersection::TypeUndefined);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorUndetermined);
  P out;
  EXPECT_EQ(seg.ConstructIntersection(P(0, 0), P(2, 0), P(1, -1), P(1, 1), out), E_FAIL);
}

// A caller's constructor is used for proper crossings; a shared vertex is returned as it is.
TEST_P(SegmentKnown, CallerConstructor)
{
  RKMPolyExactArithmetic arith(GetParam());
  RKMPolyIntersectionPointClosestPointConstructor2D closest(0.75);
  RKMPolySegmentIntersector2D seg(arith, closest);
  // d lies 0.35 from ab's line, inside ab's box; the rest are farther.
  const P a(0, 0), b(4, 4), c(3, 0), d(1.5, 2);
  ASSERT_EQ(seg.Intersect(a, b, c, d), 1);
  P out;
  ASSERT_EQ(seg.ConstructIntersection(a, b, c, d, out), S_OK);
  EXPECT_EQ(out, d);
  // Every extremity farther than the tolerance: the constructor's failure comes through.
  const P e(1, 3);
  ASSERT_EQ(seg.Intersect(a, b, c, e), 1);
  out = P(7, 7);
  EXPECT_TRUE(FAILED(seg.ConstructIntersection(a, b, c, e, out)));
  EXPECT_EQ(out, P(7, 7));
}

INSTANTIATE_TEST_SUITE_P(Modes, SegmentKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(ModeName(i.param)); });

class PointSegmentSweep : public testing::TestWithParam<SweepCase>
{
};

// Random points and segments from a few grid points, single-point segments included.
TEST_P(PointSegmentSweep, MatchesExactAnswer)
{
  const SweepCase sc = GetParam();
  RKMPolyExactArithmetic arith(sc.mode);
  const RKMPolyPointSegmentIntersector2D ps(arith);
  PointSource src(sc.seed, sc.layout, sc.k);
  long mismatches = 0, where[4] = {}, misses = 0, degenerate = 0;
  for (long i = 0; i < sc.count / kScale; ++i)
  {
    src.NewCase();
    const P a = src.Next(), b = src.Next(), p = src.Next();
    const QPoint qa = Q(a), qb = Q(b), qp = Q(p);
    HRESULT wantHr = S_FALSE;
    Type wantType = RKMPolyIntersection::TypeNone;
    Error wantError = RKMPolyIntersection::ErrorNone;
    int wantWhere = 0;
    // Left as they were for a single-point segment away from p.
    const Type kUnset = static_cast<Type>(77);
    const int kUnsetWhere = 55;
    if (qa == qb)
    {
      ++degenerate;
      wantError = RKMPolyIntersection::ErrorDegenerate;
      if (qp == qa)
      {
        wantHr = S_OK;
        wantType = RKMPolyIntersection::TypePoint;
        wantWhere = 2;
      }
      else
      {
        wantType = kUnset;
        wantWhere = kUnsetWhere;
      }
    }
    else if (OnClosedSegment(qa, qb, qp))
    {
      wantHr = S_OK;
      wantType = RKMPolyIntersection::TypePoint;
      wantWhere = qp == qa ? 1 : (qp == qb ? 3 : 2);
    }
    else
      ++misses;
    ++where[wantHr == S_OK ? wantWhere : 0];

    Type type = kUnset;
    Error error = RKMPolyIntersection::ErrorUndetermined;
    int w = kUnsetWhere;
    const HRESULT hr = ps.Intersect(a, b, p, type, error, &w);
    Type type2 = kUnset;
    Error error2 = RKMPolyIntersection::ErrorUndetermined;
    const HRESULT hr2 = ps.Intersect(a, b, p, type2, error2, nullptr);
    if (hr != wantHr || type != wantType || error != wantError || w != wantWhere || hr2 != hr || type2 != type ||
        error2 != error)
      if (mismatches++ < 5)
        ADD_FAILURE() << "seed " << sc.seed << " case " << i << ": " << Str(a) << "-" << Str(b) << " p " << Str(p)
                      << ": got hr " << hr << " type " << type << " error " << error << " where " << w
                      << ", expected hr " << wantHr << " type " << wantType << " error " << wantError << " where "
                      << wantWhere;
  }
  EXPECT_EQ(mismatches, 0) << "seed " << sc.seed;
  if (sc.layout < Layout::Skewed)
  {
    for (int k = 1; k < 4; ++k)
      EXPECT_GT(where[k], 0) << k;
    EXPECT_GT(degenerate, 0);
  }
  EXPECT_GT(misses, 0);
}

INSTANTIATE_TEST_SUITE_P(
    Random, PointSegmentSweep,
    testing::Values(SweepCase{RKMPolyExactArithmetic::Gridded, Layout::SmallGrid, 3, 100000, 41},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::SmallGrid, 4, 100000, 42},
                    SweepCase{RKMPolyExactArithmetic::Gridded, Layout::Lattice, 4, 100000, 43},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Lattice, 3, 100000, 44},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Skewed, 3, 100000, 45},
                    SweepCase{RKMPolyExactArithmetic::Adaptive, Layout::Extreme, 4, 100000, 46}),
    [](const testing::TestParamInfo<SweepCase> &i) { return SweepName(i.param); });

class PointSegmentKnown : public testing::TestWithParam<Mode>
{
};

TEST_P(PointSegmentKnown, EndsInsideOutsideAndSinglePoint)
{
  RKMPolyExactArithmetic arith(GetParam());
  const RKMPolyPointSegmentIntersector2D ps(arith);
  const P a(0, 0), b(4, 2);
  Type type;
  Error error;
  int where = -1;
  EXPECT_EQ(ps.Intersect(a, b, a, type, error, &where), S_OK);
  EXPECT_EQ(where, 1);
  EXPECT_EQ(ps.Intersect(a, b, b, type, error, &where), S_OK);
  EXPECT_EQ(where, 3);
  EXPECT_EQ(ps.Intersect(a, b, P(2, 1), type, error, &where), S_OK);
  EXPECT_EQ(where, 2);
  EXPECT_EQ(type, RKMPolyIntersection::TypePoint);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorNone);
  // On the line beyond b, and off the line.
  EXPECT_EQ(ps.Intersect(a, b, P(6, 3), type, error, &where), S_FALSE);
  EXPECT_EQ(where, 0);
  EXPECT_EQ(type, RKMPolyIntersection::TypeNone);
  EXPECT_EQ(ps.Intersect(a, b, P(2, 2), type, error, nullptr), S_FALSE);

  EXPECT_EQ(ps.Intersect(b, b, b, type, error, &where), S_OK);
  EXPECT_EQ(where, 2);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorDegenerate);
  type = RKMPolyIntersection::TypeOverlap;
  where = 9;
  EXPECT_EQ(ps.Intersect(b, b, a, type, error, &where), S_FALSE);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorDegenerate);
  EXPECT_EQ(type, RKMPolyIntersection::TypeOverlap);
  EXPECT_EQ(where, 9);
}

INSTANTIATE_TEST_SUITE_P(Modes, PointSegmentKnown,
                         testing::Values(RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive),
                         [](const testing::TestParamInfo<Mode> &i) { return std::string(ModeName(i.param)); });

// The Adaptive mode is exact on any finite doubles, so scaling a configuration by a power of two
// must not change any answer.
TEST(AdaptiveIntersectors, TinyCoordinates)
{
  // At this scale the products of coordinate differences underflow: a kernel that trusted them
  // would call every triple collinear.
  RKMPolyExactArithmetic arith(RKMPolyExactArithmetic::Adaptive);
  const double s = std::ldexp(1.0, -540);
  const RKMPolyPointSegmentIntersector2D ps(arith);
  Type type;
  Error error;
  int where = -1;
  EXPECT_EQ(ps.Intersect(P(0, 0), P(2 * s, 0), P(s, s), type, error, &where), S_FALSE);
  EXPECT_EQ(where, 0);
  RKMPolySegmentIntersector2D seg(arith);
  EXPECT_EQ(seg.Intersect(P(0, 0), P(2 * s, 0), P(s, -s), P(s, s)), 1);
  EXPECT_EQ(seg.GetEntityType(0), 2);
  EXPECT_EQ(seg.GetEntityType(1), 2);
}

TEST(ClosestPointConstructor, FindClosestExtremity)
{
  double d2 = -1;
  // a 1 from cd's line, b 3, c 0.8 (squared) from ab's line, d 7.2.
  EXPECT_EQ(RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(P(0, 1), P(4, 3), P(0, 0),
                                                                                   P(4, 0), d2),
            3);
  EXPECT_DOUBLE_EQ(d2, 0.8);
  // All four at the same distance: the first wins.
  EXPECT_EQ(RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(P(-1, -1), P(1, 1), P(-1, 1),
                                                                                   P(1, -1), d2),
            1);
  EXPECT_DOUBLE_EQ(d2, 2.0);
  // b and d both on the other line: b comes first.
  EXPECT_EQ(RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(P(0, 3), P(2, 0), P(2, 0),
                                                                                   P(5, 1), d2),
            2);
  EXPECT_EQ(d2, 0.0);
  // A single-point second segment: a and b are measured to it (25 and 1), which must not poison the
  // comparison with c's 0.8.
  EXPECT_EQ(RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(P(0, 3), P(4, 1), P(4, 0),
                                                                                   P(4, 0), d2),
            3);
  EXPECT_DOUBLE_EQ(d2, 0.8);
  // A single-point first segment: c and d are measured to a.
  EXPECT_EQ(RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(P(4, 0), P(4, 0), P(0, 3),
                                                                                   P(4, 1), d2),
            1);
  EXPECT_DOUBLE_EQ(d2, 0.8);
}

// On exact small-grid data the choice follows the exact squared distances.
TEST(ClosestPointConstructor, FindClosestExtremityMatchesExactDistances)
{
  const std::uint64_t seed = 51;
  PointSource src(seed, Layout::SmallGrid, 4);
  int mismatches = 0;
  for (int i = 0; i < 50000 / kScale; ++i)
  {
    const P a = src.Next(), b = src.Next(), c = src.Next(), d = src.Next();
    if (a == b || c == d)
      continue;
    double d2;
    const int got = RKMPolyIntersectionPointClosestPointConstructor2D::FindClosestExtremity(a, b, c, d, d2);
    const int want = ClosestExtremityOracle(a, b, c, d);
    if (got != want && mismatches++ < 5)
      ADD_FAILURE() << "seed " << seed << " case " << i << ": " << Describe(a, b, c, d) << " got " << got
                    << ", expected " << want;
  }
  EXPECT_EQ(mismatches, 0) << "seed " << seed;
}

TEST(ClosestPointConstructor, Compute)
{
  const RKMPolyIntersectionPointClosestPointConstructor2D closest(0.6);
  P out(9, 9);
  // c is 0.35 from ab's line and within ab's box; a and b lie outside cd's box.
  ASSERT_EQ(closest.Compute(P(0, 0), P(4, 4), P(1, 1.5), P(3, -1), out), S_OK);
  EXPECT_EQ(out, P(1, 1.5));
  // c (0.15 away) is nearer ab's line than d (0.39 away) but below ab's box, so d is taken.
  ASSERT_EQ(closest.Compute(P(0, 0), P(4, 1), P(0.4, -0.05), P(2, 0.9), out), S_OK);
  EXPECT_EQ(out, P(2, 0.9));
  // All extremities 1.41 away: failure, out untouched.
  out = P(9, 9);
  EXPECT_TRUE(FAILED(closest.Compute(P(0, 0), P(4, 4), P(1, 3), P(3, 1), out)));
  EXPECT_EQ(out, P(9, 9));
}

TEST(DefaultConstructor, LineCrossing)
{
  const RKMPolyIntersectionPointDefaultConstructor2D def(0.0);
  P out;
  ASSERT_EQ(def.Compute(P(0, 0), P(4, 4), P(0, 4), P(4, 0), out), S_OK);
  EXPECT_DOUBLE_EQ(out.x, 2.0);
  EXPECT_DOUBLE_EQ(out.y, 2.0);
  ASSERT_EQ(def.Compute(P(0, 0), P(4, 0), P(1, -1), P(3, 3), out), S_OK);
  EXPECT_DOUBLE_EQ(out.x, 1.5);
  EXPECT_DOUBLE_EQ(out.y, 0.0);
  // cd crosses ab's line at (9/7, 9/7), 0.35 from c; a tolerance above that picks c instead.
  ASSERT_EQ(def.Compute(P(0, 0), P(4, 4), P(1, 1.5), P(3, 0), out), S_OK);
  EXPECT_NEAR(out.x, 9.0 / 7, 1e-12);
  EXPECT_NEAR(out.y, 9.0 / 7, 1e-12);
  const RKMPolyIntersectionPointDefaultConstructor2D loose(0.5);
  ASSERT_EQ(loose.Compute(P(0, 0), P(4, 4), P(1, 1.5), P(3, 0), out), S_OK);
  EXPECT_EQ(out, P(1, 1.5));
}

// The crossing of the lines lies beyond ab's end: clamping brings it back into ab's box.
TEST(DefaultConstructor, ClampsIntoBoxes)
{
  const RKMPolyIntersectionPointDefaultConstructor2D def(0.0);
  P out;
  // Lines cross at (5, 0), the far end of cd; ab ends at x = 4.
  ASSERT_EQ(def.Compute(P(0, 0), P(4, 0), P(3, -2), P(5, 0), out), S_OK);
  EXPECT_TRUE(InBox(P(0, 0), P(4, 0), out)) << Str(out);
  EXPECT_TRUE(InBox(P(3, -2), P(5, 0), out)) << Str(out);
  EXPECT_EQ(out, P(4, 0));

  // Random crossing segments with inexact data: the point stays in both boxes.
  const std::uint64_t seed = 52;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-10, 10);
  int bad = 0;
  for (int i = 0; i < 20000 / kScale; ++i)
  {
    const P a(u(rng), u(rng)), b(u(rng), u(rng)), c(u(rng), u(rng)), d(u(rng), u(rng));
    if (IntersectSegments(Q(a), Q(b), Q(c), Q(d)).result != 1)
      continue;
    if (def.Compute(a, b, c, d, out) != S_OK || !InBox(a, b, out) || !InBox(c, d, out))
      if (bad++ < 5)
        ADD_FAILURE() << "seed " << seed << " case " << i << ": " << Describe(a, b, c, d) << " gives " << Str(out);
  }
  EXPECT_EQ(bad, 0);
}

// Non-finite coordinates never produce a NaN point reported as a success; a failure leaves out as
// it was.
TEST(DefaultConstructor, NonFiniteInput)
{
  const double specials[] = {kNaN, kInf, -kInf};
  for (double tol : {0.0, 0.5, kInf})
  {
    const RKMPolyIntersectionPointDefaultConstructor2D def(tol);
    const RKMPolyIntersectionPointClosestPointConstructor2D closest(tol);
    for (int slot = 0; slot < 8; ++slot)
      for (double s : specials)
      {
        double v[8] = {0, 0, 4, 4, 0, 4, 4, 0};
        v[slot] = s;
        const P a(v[0], v[1]), b(v[2], v[3]), c(v[4], v[5]), d(v[6], v[7]);
        for (const RKMPolyIntersectionPointConstructor2D *con :
             {static_cast<const RKMPolyIntersectionPointConstructor2D *>(&def),
              static_cast<const RKMPolyIntersectionPointConstructor2D *>(&closest)})
        {
          P out(7, 7);
          const HRESULT hr = con->Compute(a, b, c, d, out);
          if (hr == S_OK)
          {
            EXPECT_FALSE(std::isnan(out.x) || std::isnan(out.y))
                << "tolerance " << tol << ": " << Describe(a, b, c, d) << " gives " << Str(out);
          }
          else
          {
            EXPECT_EQ(out, P(7, 7)) << Describe(a, b, c, d);
          }
        }
      }
  }
}

} // namespace
