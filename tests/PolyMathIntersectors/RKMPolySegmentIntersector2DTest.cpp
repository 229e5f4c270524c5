#include "RKMPolySegmentIntersector2D.h"

#include "IntersectSweep.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyIntersectionPointClosestPointConstructor2D.h"
#include "RKMPolyIntersectionPointDefaultConstructor2D.h"
#include "RKMPolyPointSegmentIntersector2D.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <random>
#include <string>

namespace
{
using namespace oracle;
using P = RKMMathPoint2D;
using Type = RKMPolyIntersection::Type;
using Error = RKMPolyIntersection::Error;
using Closest = RKMPolyIntersectionPointClosestPointConstructor2D;

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

std::string Features(const RKMPolySegmentIntersector2D &seg)
{
  Feature f[2];
  for (int i = 0; i < 2; ++i)
    f[i] = {seg.GetEntityType(i), seg.GetEntityType(i) == 1 ? seg.GetVertexIndex(i) : 0};
  return Str(f[0]) + "x" + Str(f[1]);
}

// Everything the segment intersector answers on one query, against the exact answer: the code with
// and without type and error, colinearity, the features, the constructed point (exact at a shared
// vertex, in both boxes, and near the crossing where the data allow) and the closest extremity (the
// exact one on the small grid; after an overlap the extremity strictly inside the other segment).
std::string CheckSegments(RKMPolySegmentIntersector2D &seg, const RKMPolyExactArithmetic &arith, Layout layout,
                          const P &a, const P &b, const P &c, const P &d, const CrossAnswer &ans)
{
  Type type = RKMPolyIntersection::TypePoint;
  Error error = RKMPolyIntersection::ErrorUndetermined;
  const int plain = seg.Intersect(a, b, c, d), got = seg.Intersect(a, b, c, d, type, error);
  if (plain != got || got != ans.result)
    return "result " + std::to_string(plain) + "/" + std::to_string(got) + ", expected " + std::to_string(ans.result);
  static const Type kType[] = {RKMPolyIntersection::TypeNone, RKMPolyIntersection::TypePoint,
                               RKMPolyIntersection::TypeOverlap};
  static const Error kError[] = {RKMPolyIntersection::ErrorNone, RKMPolyIntersection::ErrorNone,
                                 RKMPolyIntersection::ErrorColinear};
  if (type != (got < 0 ? RKMPolyIntersection::TypeUndefined : kType[got]) ||
      error != (got < 0 ? RKMPolyIntersection::ErrorDegenerate : kError[got]))
    return "type " + std::to_string(type) + " error " + std::to_string(error);
  if (got >= 0 && seg.AreSegmentsColinear() != ans.colinear)
    return "AreSegmentsColinear " + std::to_string(seg.AreSegmentsColinear());
  const Feature none;
  const std::string want = Str(got == 1 ? ans.f[0] : none) + "x" + Str(got == 1 ? ans.f[1] : none);
  if (Features(seg) != want)
    return "features " + Features(seg) + ", expected " + want;

  P out(-12345, -12345);
  const HRESULT hr = seg.ConstructIntersection(a, b, c, d, out);
  const double eps = arith.GetCoordinatePrecision(), ex = ans.x.x.get_d(), ey = ans.x.y.get_d();
  const double err = std::hypot(out.x - ex, out.y - ey);
  const bool gridded = arith.GetMode() == kGridded;
  std::string why;
  if (got != 1 && (hr != E_FAIL || !(out == P(-12345, -12345))))
    why = "ConstructIntersection after result " + std::to_string(got) + " gives " + std::to_string(hr);
  else if (got == 1 && hr != S_OK)
    why = "ConstructIntersection fails";
  else if (got == 1 && (ans.f[0].type == 1 || ans.f[1].type == 1) && !(Q(out) == ans.x))
    why = "ConstructIntersection is not the shared vertex " + Str(ans.x);
  else if (got == 1 && (!InBox(a, b, out) || !InBox(c, d, out)))
    why = "ConstructIntersection outside a segment's box";
  else if (got == 1 && layout == Layout::SmallGrid && err > (gridded ? 2 * eps : 1e-12))
    why = "ConstructIntersection " + std::to_string(err) + " from " + Str(ans.x);
  // On the lattice an extremity may lie within the snapping tolerance of the other line: it is then
  // taken as the crossing, which keeps the point near both lines though not near the true crossing.
  else if (got == 1 && layout == Layout::Lattice && gridded &&
           (DistanceToLine(out, a, b) > 5 * eps || DistanceToLine(out, c, d) > 5 * eps))
    why = "ConstructIntersection is off a line";
  else if (got == 1 && layout == Layout::Lattice && !gridded && err > 1e-9 * (1 + std::fabs(ex) + std::fabs(ey)))
    why = "ConstructIntersection " + std::to_string(err) + " from " + Str(ans.x);
  if (!why.empty())
    return why + ": " + Str(out);

  int which = -1, expect = got == 1 && layout == Layout::SmallGrid ? ClosestExtremity(Q(a), Q(b), Q(c), Q(d)) : -1;
  const HRESULT ce = seg.GetClosestExtremity(a, b, c, d, which);
  if (got == 2)
  {
    const QPoint q[4] = {Q(a), Q(b), Q(c), Q(d)};
    static const int kInside[4][3] = {{0, 1, 2}, {0, 1, 3}, {2, 3, 0}, {2, 3, 1}};
    expect = 0;
    for (int k = 3; k >= 0; --k)
    {
      const auto &s = kInside[k];
      if (OnClosedSegment(q[s[0]], q[s[1]], q[s[2]]) && !(q[s[2]] == q[s[0]]) && !(q[s[2]] == q[s[1]]))
        expect = s[2] + 1;
    }
  }
  const bool ok = got == 1 ? ce == S_OK && which >= 1 && which <= 4 && (expect < 0 || which == expect)
                           : got == 2 ? ce == S_OK && which == expect : ce == E_FAIL;
  return ok ? std::string() : "GetClosestExtremity " + std::to_string(ce) + " " + std::to_string(which) +
                                  ", expected " + std::to_string(expect);
}

// Random segment pairs from a few grid points, each in its eight forms (SegmentForm): crossings,
// touching ends, collinear overlaps and gaps, and single-point segments.
using SegmentSweep = SweepTest;
TEST_P(SegmentSweep, MatchesExactAnswer)
{
  const SweepCase sc = GetParam();
  RKMPolyExactArithmetic arith(sc.mode);
  RKMPolySegmentIntersector2D seg(arith);
  Seen seen;
  Sweep<2>(sc, kScale, [&](PointSource &src) {
    const P pt[4] = {src.Next(), src.Next(), src.Next(), src.Next()};
    for (int form = 0; form < 8; ++form)
    {
      const std::array<int, 4> i = SegmentForm(form);
      const P &a = pt[i[0]], &b = pt[i[1]], &c = pt[i[2]], &d = pt[i[3]];
      const CrossAnswer ans = IntersectSegments(Q(a), Q(b), Q(c), Q(d));
      seen(std::to_string(ans.result < 0 ? -5 : ans.result));
      if (ans.result == 1 && ans.f[0].type == 2 && ans.f[1].type == 2)
        seen("crossing");
      const std::string why = CheckSegments(seg, arith, sc.layout, a, b, c, d, ans);
      if (!why.empty())
        return Describe(a, b, c, d) + ": " + why;
    }
    return std::string();
  });
  seen.Expect({"0", "crossing"});
  if (sc.layout < Layout::Skewed)
    seen.Expect({"1", "2", "-5"});
}
RKM_SWEEPS(SegmentSweep,
           SweepCase{kGridded, kSmallGrid, 3, 40000, 31}, SweepCase{kAdaptive, kSmallGrid, 4, 40000, 32},
           SweepCase{kGridded, kLattice, 4, 40000, 33}, SweepCase{kAdaptive, kLattice, 3, 40000, 34},
           SweepCase{kAdaptive, kSkewed, 3, 40000, 35}, SweepCase{kAdaptive, kExtreme, 4, 40000, 36});

// Crossing (at exactly (1, 0)), sharing an end, overlapping (closest extremity: the one inside the
// other segment, none for identical segments), single points, apart, and a crossing whose closest
// extremity lies 0.5 from the other line; a caller's constructor is used for proper crossings, and its
// failure comes through with out untouched; without an arithmetic every query is undetermined.
TEST(Segment2D, KnownCases)
{
  const P o(0, 0), e(2, 0);
  const struct
  {
    P a, b, c, d;
    int result;
    const char *features;
    int closest; // -1: E_FAIL
  } cases[] = {{o, e, P(1, -1), P(1, 1), 1, "B0xB0", 1}, {o, e, e, P(3, 0), 1, "V1xV0", 1},
               {o, e, P(1, 0), P(3, 0), 2, "?0x?0", 3},  {o, e, e, o, 2, "?0x?0", 0},
               {o, o, P(1, 0), P(3, 0), -5, "?0x?0", -1}, {o, P(1, 0), P(3, 3), P(3, 3), -5, "?0x?0", -1},
               {o, e, P(3, 0), P(5, 0), 0, "?0x?0", -1}, {o, P(4, 0), P(1, -3), P(2, 0.5), 1, "B0xB0", 4}};
  for (Mode m : kModes)
  {
    RKMPolyExactArithmetic arith(m);
    RKMPolySegmentIntersector2D seg(arith);
    for (const auto &k : cases)
    {
      const std::string what = std::string(ModeName(m)) + " " + Describe(k.a, k.b, k.c, k.d);
      int which = -1;
      EXPECT_EQ(seg.Intersect(k.a, k.b, k.c, k.d), k.result) << what;
      EXPECT_EQ(Features(seg), k.features) << what;
      EXPECT_EQ(seg.GetClosestExtremity(k.a, k.b, k.c, k.d, which), k.closest < 0 ? E_FAIL : S_OK) << what;
      EXPECT_TRUE(k.closest < 0 || which == k.closest) << what << ": " << which;
    }
    P out;
    ASSERT_EQ(seg.Intersect(o, e, P(1, -1), P(1, 1)), 1);
    ASSERT_EQ(seg.ConstructIntersection(o, e, P(1, -1), P(1, 1), out), S_OK);
    EXPECT_EQ(out, P(1, 0));
    // d lies 0.35 from ab's line, inside ab's box, the rest farther; with (1, 3) every extremity is
    // farther than the tolerance.
    Closest closest(0.75);
    RKMPolySegmentIntersector2D withCaller(arith, closest);
    const P a(0, 0), b(4, 4), c(3, 0), d(1.5, 2);
    ASSERT_EQ(withCaller.Intersect(a, b, c, d), 1);
    ASSERT_EQ(withCaller.ConstructIntersection(a, b, c, d, out), S_OK);
    EXPECT_EQ(out, d);
    ASSERT_EQ(withCaller.Intersect(a, b, c, P(1, 3)), 1);
    out = P(7, 7);
    EXPECT_TRUE(FAILED(withCaller.ConstructIntersection(a, b, c, P(1, 3), out)));
    EXPECT_EQ(out, P(7, 7));
  }
  RKMPolySegmentIntersector2D none(static_cast<const RKMPolyExactArithmetic *>(nullptr));
  Type type;
  Error error;
  P out;
  EXPECT_EQ(none.Intersect(o, e, P(1, -1), P(1, 1), type, error), -1);
  EXPECT_EQ(type, RKMPolyIntersection::TypeUndefined);
  EXPECT_EQ(error, RKMPolyIntersection::ErrorUndetermined);
  EXPECT_EQ(none.ConstructIntersection(o, e, P(1, -1), P(1, 1), out), E_FAIL);
}

// Random points and segments from a few grid points, single-point segments included: where the point
// lies (1 at a, 3 at b, 2 inside), or nothing; a single-point segment leaves type and where alone
// when it misses the point.
using PointSegmentSweep = SweepTest;
TEST_P(PointSegmentSweep, MatchesExactAnswer)
{
  const SweepCase sc = GetParam();
  RKMPolyExactArithmetic arith(sc.mode);
  const RKMPolyPointSegmentIntersector2D ps(arith);
  const Type kUnset = static_cast<Type>(77);
  const int kUnsetWhere = 55;
  Seen seen;
  Sweep<2>(sc, kScale, [&](PointSource &src) {
    const P a = src.Next(), b = src.Next(), p = src.Next();
    const QPoint qa = Q(a), qb = Q(b), qp = Q(p);
    const bool single = qa == qb, on = single ? qp == qa : OnClosedSegment(qa, qb, qp);
    const HRESULT wantHr = on ? S_OK : S_FALSE;
    const Type wantType = on ? RKMPolyIntersection::TypePoint : single ? kUnset : RKMPolyIntersection::TypeNone;
    const Error wantError = single ? RKMPolyIntersection::ErrorDegenerate : RKMPolyIntersection::ErrorNone;
    const int wantWhere = !on ? (single ? kUnsetWhere : 0) : single || !(qp == qa || qp == qb) ? 2 : qp == qa ? 1 : 3;
    seen(single ? "single" : std::to_string(on ? wantWhere : 0));
    Type type = kUnset, type2 = kUnset;
    Error error = RKMPolyIntersection::ErrorUndetermined, error2 = error;
    int where = kUnsetWhere;
    const HRESULT hr = ps.Intersect(a, b, p, type, error, &where), hr2 = ps.Intersect(a, b, p, type2, error2, nullptr);
    if (hr == wantHr && type == wantType && error == wantError && where == wantWhere && hr2 == hr && type2 == type &&
        error2 == error)
      return std::string();
    return Str(a) + "-" + Str(b) + " p " + Str(p) + ": got hr " + std::to_string(hr) + " type " + std::to_string(type) +
           " error " + std::to_string(error) + " where " + std::to_string(where) + ", expected hr " +
           std::to_string(wantHr) + " type " + std::to_string(wantType) + " error " + std::to_string(wantError) +
           " where " + std::to_string(wantWhere);
  });
  seen.Expect({"0"});
  if (sc.layout < Layout::Skewed)
    seen.Expect({"1", "2", "3", "single"});
}
RKM_SWEEPS(PointSegmentSweep,
           SweepCase{kGridded, kSmallGrid, 3, 100000, 41}, SweepCase{kAdaptive, kSmallGrid, 4, 100000, 42},
           SweepCase{kGridded, kLattice, 4, 100000, 43}, SweepCase{kAdaptive, kLattice, 3, 100000, 44},
           SweepCase{kAdaptive, kSkewed, 3, 100000, 45}, SweepCase{kAdaptive, kExtreme, 4, 100000, 46});

// FindClosestExtremity: a 1 from cd's line, b 3, c 0.8 (squared) from ab's line, d 7.2; all four at one
// distance, the first wins; b and d both on the other line, b first; a single-point segment measures the
// other one's ends to its point without poisoning the comparison. Then the exact squared distances on
// random small-grid data decide.
TEST(ClosestPointConstructor, FindClosestExtremity)
{
  const struct
  {
    P a, b, c, d;
    int which;
    double d2;
  } cases[] = {{P(0, 1), P(4, 3), P(0, 0), P(4, 0), 3, 0.8}, {P(-1, -1), P(1, 1), P(-1, 1), P(1, -1), 1, 2.0},
               {P(0, 3), P(2, 0), P(2, 0), P(5, 1), 2, 0.0},  {P(0, 3), P(4, 1), P(4, 0), P(4, 0), 3, 0.8},
               {P(4, 0), P(4, 0), P(0, 3), P(4, 1), 1, 0.8}};
  for (const auto &k : cases)
  {
    double d2 = -1;
    EXPECT_EQ(Closest::FindClosestExtremity(k.a, k.b, k.c, k.d, d2), k.which) << Describe(k.a, k.b, k.c, k.d);
    EXPECT_DOUBLE_EQ(d2, k.d2) << Describe(k.a, k.b, k.c, k.d);
  }
  const std::uint64_t seed = 51;
  PointSource src(seed, Layout::SmallGrid, 4);
  int mismatches = 0;
  for (int i = 0; i < 50000 / kScale; ++i)
  {
    const P a = src.Next(), b = src.Next(), c = src.Next(), d = src.Next();
    double d2;
    if (a == b || c == d)
      continue;
    const int got = Closest::FindClosestExtremity(a, b, c, d, d2), want = ClosestExtremity(Q(a), Q(b), Q(c), Q(d));
    if (got != want && mismatches++ < 5)
      ADD_FAILURE() << "seed " << seed << " case " << i << ": " << Describe(a, b, c, d) << " got " << got
                    << ", expected " << want;
  }
  EXPECT_EQ(mismatches, 0) << "seed " << seed;
}

// The closest-point constructor takes the extremity nearest the other line among those inside the
// other segment's box, within the tolerance (c, 0.35 away; d, because c is below ab's box), or fails
// and leaves out alone. The default one takes the crossing of the lines, or an extremity within its
// tolerance of the other line ((9/7, 9/7) lies 0.35 from c), clamped into both boxes: (5, 0), where the
// lines cross, is beyond ab's end.
TEST(PointConstructors, KnownCases)
{
  const RKMPolyIntersectionPointDefaultConstructor2D exact(0.0), loose(0.5);
  const Closest closest(0.6);
  const struct
  {
    const RKMPolyIntersectionPointConstructor2D *con;
    P a, b, c, d;
    HRESULT hr;
    P out;
  } cases[] = {{&closest, P(0, 0), P(4, 4), P(1, 1.5), P(3, -1), S_OK, P(1, 1.5)},
               {&closest, P(0, 0), P(4, 1), P(0.4, -0.05), P(2, 0.9), S_OK, P(2, 0.9)},
               {&closest, P(0, 0), P(4, 4), P(1, 3), P(3, 1), E_FAIL, P(9, 9)},
               {&exact, P(0, 0), P(4, 4), P(0, 4), P(4, 0), S_OK, P(2, 2)},
               {&exact, P(0, 0), P(4, 0), P(1, -1), P(3, 3), S_OK, P(1.5, 0)},
               {&exact, P(0, 0), P(4, 4), P(1, 1.5), P(3, 0), S_OK, P(9.0 / 7, 9.0 / 7)},
               {&loose, P(0, 0), P(4, 4), P(1, 1.5), P(3, 0), S_OK, P(1, 1.5)},
               {&exact, P(0, 0), P(4, 0), P(3, -2), P(5, 0), S_OK, P(4, 0)}};
  for (const auto &k : cases)
  {
    P out(9, 9);
    const HRESULT hr = k.con->Compute(k.a, k.b, k.c, k.d, out);
    EXPECT_TRUE(k.hr == S_OK ? hr == S_OK : FAILED(hr)) << Describe(k.a, k.b, k.c, k.d);
    EXPECT_NEAR(out.x, k.out.x, 1e-12) << Describe(k.a, k.b, k.c, k.d);
    EXPECT_NEAR(out.y, k.out.y, 1e-12) << Describe(k.a, k.b, k.c, k.d);
  }
}

// Random crossing segments with inexact data: the default constructor's point stays in both boxes.
TEST(PointConstructors, DefaultStaysInBoxes)
{
  const RKMPolyIntersectionPointDefaultConstructor2D def(0.0);
  const std::uint64_t seed = 52;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-10, 10);
  int bad = 0;
  for (int i = 0; i < 20000 / kScale; ++i)
  {
    const P a(u(rng), u(rng)), b(u(rng), u(rng)), c(u(rng), u(rng)), d(u(rng), u(rng));
    P out;
    if (IntersectSegments(Q(a), Q(b), Q(c), Q(d)).result == 1 &&
        (def.Compute(a, b, c, d, out) != S_OK || !InBox(a, b, out) || !InBox(c, d, out)) && bad++ < 5)
      ADD_FAILURE() << "seed " << seed << " case " << i << ": " << Describe(a, b, c, d) << " gives " << Str(out);
  }
  EXPECT_EQ(bad, 0) << "seed " << seed;
}

// Non-finite coordinates in any slot, with any tolerance, never produce a NaN point reported as a
// success; a failure leaves out as it was.
TEST(PointConstructors, NonFiniteInput)
{
  const double inf = std::numeric_limits<double>::infinity();
  for (double tol : {0.0, 0.5, inf})
  {
    const RKMPolyIntersectionPointDefaultConstructor2D def(tol);
    const Closest closest(tol);
    for (int slot = 0; slot < 8; ++slot)
      for (double s : {std::numeric_limits<double>::quiet_NaN(), inf, -inf})
      {
        double v[8] = {0, 0, 4, 4, 0, 4, 4, 0};
        v[slot] = s;
        const P a(v[0], v[1]), b(v[2], v[3]), c(v[4], v[5]), d(v[6], v[7]);
        for (const RKMPolyIntersectionPointConstructor2D *con :
             {static_cast<const RKMPolyIntersectionPointConstructor2D *>(&def),
              static_cast<const RKMPolyIntersectionPointConstructor2D *>(&closest)})
        {
          P out(7, 7);
          const bool ok = con->Compute(a, b, c, d, out) == S_OK;
          EXPECT_TRUE(ok ? !std::isnan(out.x) && !std::isnan(out.y) : out == P(7, 7))
              << "tolerance " << tol << ": " << Describe(a, b, c, d) << " gives " << Str(out);
        }
      }
  }
}

} // namespace
