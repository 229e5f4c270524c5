#include "ExactRefCases.h"
#include "ExactRefOracle.h"

#include "RKMPolyConstruction.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactPredicates.h"

#include "RKMMathBox.h"
#include "RKMMathPlane.h"
#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMMathVector.h"

#include <gtest/gtest.h>

#include <cfloat>
#include <cstring>
#include <limits>
#include <random>
#include <vector>

using exactref::Hex;

namespace
{
using Arith = RKMPolyExactArithmetic;
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN(), kInf = std::numeric_limits<double>::infinity();

std::string Str(const RKMMathPoint &p) { return "(" + Hex(p.x) + ", " + Hex(p.y) + ", " + Hex(p.z) + ")"; }
bool SameBits(const RKMMathPoint &a, const RKMMathPoint &b) { return std::memcmp(&a, &b, sizeof a) == 0; }

struct IPt
{
  std::int64_t x, y;
  bool operator==(const IPt &o) const { return x == o.x && y == o.y; }
};
std::int64_t Cross(const IPt &o, const IPt &a, const IPt &b)
{
  return (a.x - o.x) * (b.y - o.y) - (a.y - o.y) * (b.x - o.x);
}
bool OnSegment(const IPt &a, const IPt &b, const IPt &p)
{
  return Cross(a, b, p) == 0 && std::min(a.x, b.x) <= p.x && p.x <= std::max(a.x, b.x) && std::min(a.y, b.y) <= p.y &&
         p.y <= std::max(a.y, b.y);
}

// 0 on some closed edge, otherwise the even-odd parity of a rightward ray (+1 inside, -1 outside).
int OracleClass(const std::vector<IPt> &v, const IPt &p)
{
  bool inside = false;
  for (size_t i = 0, n = v.size(); i < n; ++i)
  {
    const IPt &a = v[i], &b = v[(i + 1) % n];
    if (OnSegment(a, b, p))
      return 0;
    if ((a.y > p.y) != (b.y > p.y))
      inside ^= Cross(a.y < b.y ? a : b, a.y < b.y ? b : a, p) > 0;
  }
  return inside ? 1 : -1;
}

// Neighbouring edges that do not fold back, other edges that do not meet (so no repeated vertex).
bool IsSimple(const std::vector<IPt> &v)
{
  auto side = [](const IPt &a, const IPt &b, const IPt &c) { return (Cross(a, b, c) > 0) - (Cross(a, b, c) < 0); };
  const size_t n = v.size();
  for (size_t i = 0; i < n; ++i)
    for (size_t j = i + 1; j < n; ++j)
    {
      const IPt &a = v[i], &b = v[(i + 1) % n], &c = v[j], &d = v[(j + 1) % n];
      const bool next = j == i + 1, last = i == 0 && j == n - 1;
      if ((next && (OnSegment(c, d, a) || OnSegment(a, b, d))) ||
          (last && (OnSegment(c, d, b) || OnSegment(a, b, c))) ||
          (!next && !last &&
           ((side(a, b, c) * side(a, b, d) < 0 && side(c, d, a) * side(c, d, b) < 0) || OnSegment(a, b, c) ||
            OnSegment(a, b, d) || OnSegment(c, d, a) || OnSegment(c, d, b))))
        return false;
    }
  return n >= 3;
}

// How the integer coordinates reach the library: as they are, or far from the origin with a tiny
// step, where only the adaptive kernel stays exact.
const struct
{
  const char *name;
  Arith::Mode mode;
  double offset, scale;
} kPlacements[] = {{"gridded", Arith::Gridded, 0.0, 1.0},
                   {"adaptive", Arith::Adaptive, 0.0, 1.0},
                   {"adaptive2", Arith::Adaptive2, 0.0, 1.0},
                   {"adaptive-shifted", Arith::Adaptive, 0x1p20, 0x1p-30}};

// One polygon against the oracle at every point of [lo, hi]², in both vertex orders and every
// placement: the class, the edge reported for boundary points, and the class without an edge.
void CheckPolygonEverywhere(std::vector<IPt> v, std::int64_t lo, std::int64_t hi, const std::string &tag)
{
  const int n = static_cast<int>(v.size());
  for (int reversed = 0; reversed < 2; ++reversed, std::reverse(v.begin(), v.end()))
    for (const auto &pl : kPlacements)
    {
      const Arith arithmetic(pl.mode);
      auto place = [&pl](const IPt &p)
      { return RKMMathPoint2D(pl.offset + pl.scale * p.x, pl.offset + pl.scale * p.y); };
      std::vector<RKMMathPoint2D> placed;
      std::string where = tag + " " + pl.name + " polygon";
      for (const IPt &q : v)
      {
        placed.push_back(place(q));
        where += " (" + std::to_string(q.x) + "," + std::to_string(q.y) + ")";
      }
      for (std::int64_t y = lo; y <= hi; ++y)
        for (std::int64_t x = lo; x <= hi; ++x)
        {
          const IPt p{x, y};
          int edge = -7;
          const int got = RKMPolyIsInsidePolygon(placed.data(), n, place(p), arithmetic, &edge);
          ASSERT_EQ(got, OracleClass(v, p)) << where << " point " << x << "," << y;
          ASSERT_TRUE(got != 0 || (edge >= 0 && edge < n && OnSegment(v[edge], v[(edge + 1) % n], p)))
              << "edge " << edge << ", " << where << " point " << x << "," << y;
          ASSERT_EQ(RKMPolyIsInsidePolygon(placed.data(), n, place(p), arithmetic, nullptr), got) << where;
        }
    }
}
} // namespace

// No vertices: outside. A peak skipped by the half-open crossing rule, horizontal edges both ways,
// valleys, collinear vertices, with every edge midpoint on the lattice.
TEST(RKMPolyIsInsidePolygon, ShapesMatchTheOracleEverywhere)
{
  const Arith a;
  const RKMMathPoint2D v[] = {{0, 0}, {2, 0}, {1, 1}}, p(1, 0.5);
  int edge = -7;
  EXPECT_TRUE(RKMPolyIsInsidePolygon(v, 0, p, a, &edge) == -1 && RKMPolyIsInsidePolygon(v, -3, p, a, &edge) == -1 &&
              RKMPolyIsInsidePolygon(nullptr, 3, p, a, &edge) == -1 && RKMPolyIsInsidePolygon(v, 3, p, a, &edge) == 1);
  const std::vector<std::vector<IPt>> shapes = {
      {{0, 0}, {2, 0}, {1, 1}},
      {{0, 0}, {4, 0}, {4, 2}, {0, 2}},
      {{0, 0}, {24, 0}, {24, 16}, {18, 16}, {18, 4}, {12, 12}, {6, 4}, {6, 16}, {0, 16}},
      {{0, 8}, {8, 0}, {16, 8}, {24, 0}, {24, 20}, {16, 12}, {8, 20}},
      {{0, 0}, {8, 0}, {16, 0}, {16, 8}, {12, 8}, {12, 16}, {4, 16}, {4, 8}, {0, 8}},
      {{4, 0}, {20, 4}, {12, 8}, {24, 16}, {0, 24}, {8, 12}}};
  for (const auto &shape : shapes)
    CheckPolygonEverywhere(shape, -1, 25, "shape");
}

// Simple polygons, and self-intersecting, repeated and degenerate vertex lists (even-odd rule).
TEST(RKMPolyIsInsidePolygon, RandomPolygonsMatchTheOracle)
{
  std::mt19937_64 rng(0x5eed1001), other(0x5eed1002);
  std::uniform_int_distribution<int> count(3, 9), anyCount(1, 9), coord(0, 6);
  int tested = 0;
  for (int attempt = 0; tested < 150 && attempt < 200000 && !HasFatalFailure(); ++attempt)
  {
    std::vector<IPt> v(count(rng));
    for (IPt &q : v)
      q = {2 * coord(rng), 2 * coord(rng)};
    // Sorting around a centre off the lattice gives a star-shaped candidate most of the time.
    if (attempt % 2 == 0)
    {
      const double cx = 2 * coord(rng) + 0.5, cy = 2 * coord(rng) + 0.25;
      std::sort(v.begin(), v.end(),
                [cx, cy](const IPt &a, const IPt &b)
                { return std::atan2(a.y - cy, a.x - cx) < std::atan2(b.y - cy, b.x - cx); });
    }
    if (!IsSimple(v))
      continue;
    ++tested;
    CheckPolygonEverywhere(v, -1, 13, "seed 0x5eed1001 attempt " + std::to_string(attempt));
  }
  EXPECT_EQ(tested, 150);
  for (int iter = 0; iter < 150 && !HasFatalFailure(); ++iter)
  {
    std::vector<IPt> v(anyCount(other));
    for (IPt &q : v)
      q = {2 * coord(other), 2 * coord(other)};
    CheckPolygonEverywhere(v, -1, 13, "seed 0x5eed1002 case " + std::to_string(iter));
  }
}

namespace
{
int ReferenceMainAxis(double x, double y, double z)
{
  const double ax = std::fabs(x), ay = std::fabs(y), az = std::fabs(z);
  if (az > std::max(ax, ay))
    return z > 0 ? 3 : -3;
  if (ay > ax)
    return y > 0 ? 2 : -2;
  return ax > 0 ? (x > 0 ? 1 : -1) : 0;
}
} // namespace

// Vectors: edge cases, then small integers; triangles: the main axis of their normal, exact for
// small integers.
TEST(RKMPolyDirectionCodes, MainAxisOfVectorsAndTriangles)
{
  const double above = std::nextafter(1.0, 2.0);
  const std::pair<RKMMathVector, int> cases[] = {
      {{1, 1, above}, 3}, {{-0.0, 0, 0}, 0}, {{kNaN, kNaN, kNaN}, 0}, {{1e-310, 0, 0}, 1}, {{0, 0, -1e-310}, -3}};
  for (const auto &[v, code] : cases)
    EXPECT_EQ(RKMPolyGetMainAxisDirection(v), code) << v.x << " " << v.y << " " << v.z;
  std::mt19937_64 rng(0x5eed1003), triangles(0x5eed1004);
  std::uniform_int_distribution<int> small(-2, 2), c(-3, 3);
  for (int i = 0; i < 3000; ++i)
  {
    const RKMMathVector v(small(rng), small(rng), small(rng));
    ASSERT_EQ(RKMPolyGetMainAxisDirection(v), ReferenceMainAxis(v.x, v.y, v.z)) << "seed 0x5eed1003 case " << i;
    RKMMathPoint t[3];
    for (auto &q : t)
      for (int k = 0; k < 3; ++k)
        q[k] = c(triangles);
    const double bx = t[1].x - t[0].x, by = t[1].y - t[0].y, bz = t[1].z - t[0].z;
    const double cx = t[2].x - t[0].x, cy = t[2].y - t[0].y, cz = t[2].z - t[0].z;
    ASSERT_EQ(RKMPolyGetMainTriangleDirection(t[0], t[1], t[2]),
              ReferenceMainAxis(by * cz - bz * cy, bz * cx - bx * cz, bx * cy - by * cx))
        << "seed 0x5eed1004 case " << i;
  }
}

// Projecting along the triangle's own code must give a counter-clockwise triangle, which pins down
// the plane and the order of each code's coordinates; other codes leave the output alone.
TEST(RKMPolyDirectionCodes, ProjectionAlongMainDirectionIsCounterClockwise)
{
  for (const int bad : {0, 4, -4, 7, -100})
  {
    RKMMathPoint2D q(-9, -8);
    EXPECT_TRUE(RKMPolyProjectOntoCartesianPlane(bad, RKMMathPoint(1, 2, 3), q) == S_FALSE &&
                q == RKMMathPoint2D(-9, -8));
  }
  const Arith exact(Arith::Adaptive);
  const std::uint64_t seed = 0x5eed1005;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-4, 4);
  std::uniform_real_distribution<double> u(-1.0, 1.0);
  for (int i = 0; i < 6000; ++i)
  {
    RKMMathPoint t[3];
    for (auto &p : t)
      p = i % 2 ? RKMMathPoint(u(rng), u(rng), u(rng)) : RKMMathPoint(c(rng), c(rng), c(rng));
    const int code = RKMPolyGetMainTriangleDirection(t[0], t[1], t[2]);
    if (code == 0)
      continue;
    RKMMathPoint2D q[3];
    for (int k = 0; k < 3; ++k)
      ASSERT_EQ(RKMPolyProjectOntoCartesianPlane(code, t[k], q[k]), S_OK);
    ASSERT_EQ(exact.Orientation2D(q[0], q[1], q[2]), 1)
        << "seed " << seed << " case " << i << " code " << code << " " << Str(t[0]) << Str(t[1]) << Str(t[2]);
  }
}

// Along its own code a segment advances by at least its extent on the other axis, ties going to x;
// a null segment has no code, and other codes project to 0.
TEST(RKMPolyDirectionCodes, SegmentDirectionAndAxisProjection)
{
  for (const int bad : {0, 3, -3, 9})
    EXPECT_EQ(RKMPolyProjectOnAxis(RKMMathPoint2D(3, -5), bad), 0.0) << bad;
  const std::uint64_t seed = 0x5eed1006;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-3, 3);
  for (int i = 0; i < 3000; ++i)
  {
    const RKMMathPoint2D a(c(rng), c(rng)), b(c(rng), c(rng));
    const int code = RKMPolyGetMainSegmentDirection(a, b);
    const double along = RKMPolyProjectOnAxis(b, code) - RKMPolyProjectOnAxis(a, code);
    const double across = std::abs(code) == 1 ? std::fabs(b.y - a.y) : std::fabs(b.x - a.x);
    ASSERT_TRUE(a == b ? code == 0 : along > 0.0 && along >= across && (along > across || std::abs(code) == 1))
        << "seed " << seed << " case " << i << " code " << code;
  }
}

// Points on the default grid, in units of 1/32: collinear or coplanar, then maybe nudged by a unit
// (so often collinear in one projection only), or uniform.
TEST(RKMPolyExactPredicates, ColinearOnGridPoints)
{
  const Arith arithmetic;
  const RKMPolyExactPredicates predicates(arithmetic);
  const std::uint64_t seed = 0x5eed1007;
  exactref::Rng rng(seed);
  int collinear = 0;
  for (int i = 0; i < 20000; ++i)
  {
    exactref::GridPoints k{};
    bool made = rng.OneIn(4);
    for (int j = 0; made && j < 9; ++j)
      k[j / 3][j % 3] = rng.Int(-exactref::kGridMax, exactref::kGridMax);
    while (!made)
      made = exactref::SpannedGridPoints(rng, 3, 3, rng.OneIn(3) ? 2 : 1, k);
    if (rng.OneIn(2))
      k[rng.Int(0, 2)][rng.Int(0, 2)] += rng.OneIn(2) ? 1 : -1;
    const RKMMathPoint a(k[0][0] / 32.0, k[0][1] / 32.0, k[0][2] / 32.0),
        b(k[1][0] / 32.0, k[1][1] / 32.0, k[1][2] / 32.0), c(k[2][0] / 32.0, k[2][1] / 32.0, k[2][2] / 32.0);
    const bool expected = exactref::Collinear(a, b, c);
    collinear += expected;
    ASSERT_EQ(predicates.AreColinear(a, b, c), expected ? 1 : 0)
        << "seed " << seed << " case " << i << " " << Str(a) << Str(b) << Str(c);
  }
  EXPECT_GT(collinear, 3000);
}

// Doubles collinear up to rounding, or exactly collinear lattice points a step of 2^-40 apart,
// sometimes moved by one ulp.
TEST(RKMPolyExactPredicates, ColinearAdaptiveNearlyCollinearDoubles)
{
  const Arith arithmetic(Arith::Adaptive);
  const RKMPolyExactPredicates predicates(arithmetic);
  const std::uint64_t seed = 0x5eed1008;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(1.25, 1.75), t(0.0, 1.0);
  std::uniform_int_distribution<std::int64_t> step(-(1 << 20), 1 << 20);
  int collinear = 0;
  for (int i = 0; i < 20000; ++i)
  {
    RKMMathPoint a(u(rng), u(rng), u(rng)), b, c;
    if (i % 2 == 0)
    {
      b = RKMMathPoint(u(rng), u(rng), u(rng));
      const double s = t(rng);
      c = RKMMathPoint(a.x + s * (b.x - a.x), a.y + s * (b.y - a.y), a.z + s * (b.z - a.z));
    }
    else
    {
      const RKMMathVector d(std::ldexp(double(step(rng)), -40), std::ldexp(double(step(rng)), -40),
                            std::ldexp(double(step(rng)), -40));
      b = a + d;
      c = b + d;
      if (i % 4 == 1)
        c.y = std::nextafter(c.y, 3.0);
    }
    const bool expected = exactref::Collinear(a, b, c);
    collinear += expected;
    ASSERT_EQ(predicates.AreColinear(a, b, c), expected ? 1 : 0)
        << "seed " << seed << " case " << i << " " << Str(a) << Str(b) << Str(c);
  }
  EXPECT_GT(collinear, 2000);
}

namespace
{
RKMMathVector RandomVector(std::mt19937_64 &rng, double r)
{
  std::uniform_real_distribution<double> u(-r, r);
  return RKMMathVector(u(rng), u(rng), u(rng));
}

// p within the bounding box of the corners.
bool InBox(const RKMMathPoint &p, std::initializer_list<RKMMathPoint> corners)
{
  for (int k = 0; k < 3; ++k)
  {
    double lo = kInf, hi = -kInf;
    for (const RKMMathPoint &c : corners)
      lo = std::min(lo, c[k]), hi = std::max(hi, c[k]);
    if (!(p[k] >= lo && p[k] <= hi))
      return false;
  }
  return true;
}

const RKMMathPoint kSentinel(7.25, -7.5, 7.75);

// The construction succeeds, lands in the boxes of both operands, and within 3e-9 of the reference
// at unit scale (a reference computed in double, far more precise than that).
template <class... Args>
testing::AssertionResult Crosses(const RKMMathPoint &want, double scale, std::initializer_list<RKMMathPoint> box1,
                                 std::initializer_list<RKMMathPoint> box2, const Args &...args)
{
  RKMMathPoint got = kSentinel;
  const HRESULT hr = RKMPolyConstruction::ConstructIntersection(args..., got);
  const double d = std::max({std::fabs(got.x - want.x), std::fabs(got.y - want.y), std::fabs(got.z - want.z)});
  if (hr == S_OK && d <= 3e-9 * scale && InBox(got, box1) && InBox(got, box2))
    return testing::AssertionSuccess();
  return testing::AssertionFailure() << "HRESULT " << hr << ", " << Str(got) << " is " << d << " from " << Str(want)
                                     << " or out of the boxes";
}

// The construction gives exactly `want` (any failure leaves the sentinel, which no case wants).
template <class... Args> testing::AssertionResult Gives(const RKMMathPoint &want, const Args &...args)
{
  RKMMathPoint out = kSentinel;
  const HRESULT hr = RKMPolyConstruction::ConstructIntersection(args..., out);
  if (hr == (SameBits(want, kSentinel) ? E_FAIL : S_OK) && SameBits(out, want))
    return testing::AssertionSuccess();
  return testing::AssertionFailure() << "HRESULT " << hr << ", got " << Str(out) << ", want " << Str(want);
}
} // namespace

TEST(RKMPolyConstruction, SegmentTriangleCrossing)
{
  const std::uint64_t seed = 0x5eed2001;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> w(0.05, 1.0), len(0.1, 10.0);
  std::uniform_int_distribution<int> scaleExp(-10, 20);
  int tested = 0;
  for (int i = 0; i < 20000; ++i)
  {
    const double scale = std::ldexp(1.0, scaleExp(rng));
    const RKMMathPoint origin = RKMMathPoint(RandomVector(rng, 10 * scale));
    const RKMMathPoint a = origin + RandomVector(rng, scale), b = origin + RandomVector(rng, scale),
                       c = origin + RandomVector(rng, scale);
    const RKMMathVector n = (b - a) ^ (c - a);
    if (n.Norm() < 0.05 * scale * scale)
      continue;
    const double w0 = w(rng), w1 = w(rng), w2 = w(rng), ws = w0 + w1 + w2;
    const RKMMathPoint x((w0 * a.x + w1 * b.x + w2 * c.x) / ws, (w0 * a.y + w1 * b.y + w2 * c.y) / ws,
                         (w0 * a.z + w1 * b.z + w2 * c.z) / ws);
    RKMMathVector v = RandomVector(rng, 1.0);
    if (v.Normalize() != S_OK || std::fabs(v * n) < 0.2 * n.Norm())
      continue;
    const RKMMathPoint p = x + v * (len(rng) * scale), q = x - v * (len(rng) * scale);
    const double d0 = (p - a) * n, d1 = (q - a) * n;
    ++tested;
    ASSERT_TRUE(Crosses(p + (q - p) * (d0 / (d0 - d1)), scale, {p, q}, {a, b, c}, p, q, a, b, c))
        << "seed " << seed << " case " << i;
  }
  EXPECT_GT(tested, 5000);
}

TEST(RKMPolyConstruction, CoplanarSegmentsCrossing)
{
  const std::uint64_t seed = 0x5eed2003;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> coef(-1.0, 1.0), len(0.1, 10.0);
  std::uniform_int_distribution<int> scaleExp(-10, 20);
  int tested = 0;
  for (int i = 0; i < 20000; ++i)
  {
    const double scale = std::ldexp(1.0, scaleExp(rng));
    RKMMathVector e1 = RandomVector(rng, 1.0), e2 = RandomVector(rng, 1.0);
    if (e1.Normalize() != S_OK || e2.Normalize() != S_OK || (e1 ^ e2).Norm() < 0.3)
      continue;
    RKMMathVector u = e1 * coef(rng) + e2 * coef(rng), v = e1 * coef(rng) + e2 * coef(rng);
    if (u.Normalize() != S_OK || v.Normalize() != S_OK || (u ^ v).Norm() < 0.2)
      continue;
    const RKMMathPoint x = RKMMathPoint(RandomVector(rng, 10 * scale));
    const RKMMathPoint p0 = x - u * (len(rng) * scale), p1 = x + u * (len(rng) * scale);
    const RKMMathPoint q0 = x - v * (len(rng) * scale), q1 = x + v * (len(rng) * scale);
    // The point of line q0q1 closest to line p0p1.
    const RKMMathVector d0 = p1 - p0, d1 = q1 - q0, r = q0 - p0;
    const double aa = d0 * d0, bb = d0 * d1, cc = d1 * d1, dd = d0 * r, ee = d1 * r;
    ++tested;
    ASSERT_TRUE(
        Crosses(q0 + d1 * ((bb * dd - aa * ee) / (aa * cc - bb * bb)), scale, {p0, p1}, {q0, q1}, p0, p1, q0, q1))
        << "seed " << seed << " case " << i;
  }
  EXPECT_GT(tested, 3000);
}

TEST(RKMPolyConstruction, SegmentPlaneCrossingIsSymmetric)
{
  const std::uint64_t seed = 0x5eed2005;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> coef(-1.0, 1.0), len(0.1, 10.0);
  std::uniform_int_distribution<int> scaleExp(-10, 20);
  int tested = 0;
  for (int i = 0; i < 20000; ++i)
  {
    const double scale = std::ldexp(1.0, scaleExp(rng));
    const RKMMathVector u = RandomVector(rng, 1.0), v = RandomVector(rng, 1.0);
    const RKMMathVector n = u ^ v;
    if (n.Norm() < 0.1)
      continue;
    const RKMMathPoint o = RKMMathPoint(RandomVector(rng, 10 * scale));
    const RKMMathPlane plane(o, u, v);
    RKMMathVector w = RandomVector(rng, 1.0);
    if (w.Normalize() != S_OK || std::fabs(w * n) < 0.2 * n.Norm())
      continue;
    const RKMMathPoint x = o + u * (coef(rng) * scale) + v * (coef(rng) * scale);
    const RKMMathPoint p = x + w * (len(rng) * scale), q = x - w * (len(rng) * scale);
    const double d0 = (p - o) * n, d1 = (q - o) * n;
    RKMMathPoint pq = kSentinel;
    RKMPolyConstruction::ConstructIntersection(p, q, plane, pq);
    ++tested;
    ASSERT_TRUE(Crosses(p + (q - p) * (d0 / (d0 - d1)), scale, {p, q}, {p, q}, p, q, plane))
        << "seed " << seed << " case " << i;
    ASSERT_TRUE(Gives(pq, q, p, plane)) << "seed " << seed << " case " << i << ", the other way round";
  }
  EXPECT_GT(tested, 5000);
}

// An end that lies on the plane (or the other segment) exactly is the intersection, and must come
// back unchanged, whichever order the ends are given in: dyadic combinations of the vertices and
// axis-aligned planes keep the distances exactly 0.
TEST(RKMPolyConstruction, EndOnThePlaneComesBackExactly)
{
  std::mt19937_64 triangles(0x5eed2002), segments(0x5eed2004), planes(0x5eed2006);
  std::uniform_int_distribution<int> c(-50, 50);
  std::uniform_real_distribution<double> u(-10.0, 10.0);
  const RKMMathVector axes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
  int tested[3] = {};
  for (int i = 0; i < 5000; ++i)
  {
    const RKMMathPoint a(c(triangles), c(triangles), c(triangles)), b(c(triangles), c(triangles), c(triangles)),
        cc(c(triangles), c(triangles), c(triangles));
    const RKMMathVector n = (b - a) ^ (cc - a);
    const RKMMathPoint p =
        i % 3 == 0 ? a
                   : RKMMathPoint((a.x + b.x + 2 * cc.x) / 4, (a.y + b.y + 2 * cc.y) / 4, (a.z + b.z + 2 * cc.z) / 4);
    const RKMMathPoint q = n == RKMMathVector() ? p : p + RKMMathVector(c(triangles), c(triangles), c(triangles));
    if (!(n == RKMMathVector()) && (q - a) * n != 0.0)
    {
      ++tested[0];
      ASSERT_TRUE(Gives(p, p, q, a, b, cc)) << "seed 0x5eed2002 case " << i;
    }
    const RKMMathPoint p0(c(segments), c(segments), c(segments)), p1(c(segments), c(segments), c(segments));
    const RKMMathPoint q0 = i % 2 ? RKMMathPoint((p0.x + p1.x) / 2, (p0.y + p1.y) / 2, (p0.z + p1.z) / 2)
                                  : RKMMathPoint((3 * p0.x + p1.x) / 4, (3 * p0.y + p1.y) / 4, (3 * p0.z + p1.z) / 4);
    const RKMMathPoint q1 = q0 + RKMMathVector(c(segments), c(segments), c(segments));
    if (!(((p1 - p0) ^ (q1 - q0)) == RKMMathVector()))
    {
      ++tested[1];
      ASSERT_TRUE(Gives(q0, p0, p1, q0, q1)) << "seed 0x5eed2004 case " << i;
    }
    if (i >= 3000)
      continue;
    const int k = i % 3;
    const RKMMathPoint o(u(planes), u(planes), u(planes));
    RKMMathPoint e(u(planes), u(planes), u(planes)), f(u(planes), u(planes), u(planes));
    e[k] = o[k];
    const RKMMathPlane plane(o, axes[(k + 1) % 3], axes[(k + 2) % 3]);
    // Rebuilding the far end as f + (e − f)·1 would round away from e.
    if (f[k] != o[k])
    {
      ++tested[2];
      ASSERT_TRUE(Gives(e, e, f, plane)) << "seed 0x5eed2006 case " << i;
      ASSERT_TRUE(Gives(e, f, e, plane)) << "seed 0x5eed2006 case " << i << ", ends swapped";
    }
  }
  EXPECT_TRUE(tested[0] > 4000 && tested[1] > 4000 && tested[2] > 2900);
}

// No plane, both ends on it, parallel, overlapping or null segments, non-finite input, or a
// crossing fraction that overflows: E_FAIL and the output left alone. A normal whose plain cross
// product would overflow still gives the crossing.
TEST(RKMPolyConstruction, FailuresLeaveTheOutputAlone)
{
  const RKMMathPoint a(0, 0, 0), b(4, 0, 0), c(0, 4, 0), p(1, 1, -1), q(1, 1, 1), s(1, 1, 0), t(1, -1, 0);
  const RKMMathPlane plane; // z = 0
  for (const double bad : {kNaN, kInf, -kInf})
  {
    EXPECT_TRUE(Gives(kSentinel, RKMMathPoint(bad, 1, -1), q, a, b, c)) << bad;
    EXPECT_TRUE(Gives(kSentinel, p, RKMMathPoint(1, 1, bad), a, b, c)) << bad;
    EXPECT_TRUE(Gives(kSentinel, p, q, RKMMathPoint(0, bad, 0), b, c)) << bad;
    EXPECT_TRUE(Gives(kSentinel, a, RKMMathPoint(4, bad, 0), s, t)) << bad;
    EXPECT_TRUE(Gives(kSentinel, a, b, s, RKMMathPoint(bad, -1, 0))) << bad;
    EXPECT_TRUE(Gives(kSentinel, RKMMathPoint(0, 0, bad), q, plane)) << bad;
    EXPECT_TRUE(Gives(kSentinel, RKMMathPoint(bad, 0, -1), q, plane)) << bad;
  }
  EXPECT_TRUE(Gives(kSentinel, s, RKMMathPoint(2, 1, 0), a, b, c));
  EXPECT_TRUE(Gives(kSentinel, p, q, a, b, RKMMathPoint(8, 0, 0)));
  EXPECT_TRUE(Gives(kSentinel, a, b, RKMMathPoint(0, 1, 0), RKMMathPoint(4, 1, 0)));
  EXPECT_TRUE(Gives(kSentinel, a, b, RKMMathPoint(1, 0, 0), RKMMathPoint(3, 0, 0)));
  EXPECT_TRUE(Gives(kSentinel, a, b, s, s));
  EXPECT_TRUE(Gives(kSentinel, a, a, s, t));
  EXPECT_TRUE(Gives(kSentinel, s, RKMMathPoint(3, -4, 0), plane));
  EXPECT_TRUE(Gives(kSentinel, s, s, plane));
  EXPECT_TRUE(Gives(kSentinel, p, q, RKMMathPlane(a, RKMMathVector(1, 0, 0), RKMMathVector(2, 0, 0))));
  EXPECT_TRUE(Gives(kSentinel, RKMMathPoint(0, 0, -DBL_MAX), RKMMathPoint(0, 0, DBL_MAX), plane));
  const double big = 1e200;
  EXPECT_TRUE(Gives(RKMMathPoint(big, big, 0), RKMMathPoint(big, big, -big), RKMMathPoint(big, big, big), a,
                    RKMMathPoint(4 * big, 0, 0), RKMMathPoint(0, 4 * big, 0)));
  EXPECT_TRUE(Gives(s, p, q, a, b, c));
  EXPECT_TRUE(Gives(RKMMathPoint(1, 0, 0), a, b, RKMMathPoint(1, 0, 0), RKMMathPoint(1, 3, 0)));
  EXPECT_TRUE(Gives(RKMMathPoint(2.5, 2, 0), RKMMathPoint(2, 2, -1), RKMMathPoint(4, 2, 3), plane));
}

// Whatever the input, a success carries a finite point and a failure leaves the output alone.
TEST(RKMPolyConstruction, HostileInputsNeverYieldNaN)
{
  const std::uint64_t seed = 0x5eed2007;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> pick(0, 15);
  std::uniform_real_distribution<double> u(-10.0, 10.0);
  const double hostile[] = {kNaN, kInf, -kInf, DBL_MAX, -1e300, 1e160, 1e-300, 0.0};
  auto value = [&](int k) { return k < 8 ? hostile[k] : u(rng); };
  auto point = [&] { return RKMMathPoint(value(pick(rng)), value(pick(rng)), value(pick(rng))); };
  auto finite = [](const RKMMathPoint &p) { return std::isfinite(p.x) && std::isfinite(p.y) && std::isfinite(p.z); };
  int successes = 0;
  for (int i = 0; i < 30000; ++i)
  {
    const RKMMathPoint p = point(), q = point(), a = point(), b = point(), c = point();
    RKMMathPoint out = kSentinel;
    const HRESULT hr =
        i % 3 == 0   ? RKMPolyConstruction::ConstructIntersection(p, q, a, b, c, out)
        : i % 3 == 1 ? RKMPolyConstruction::ConstructIntersection(p, q, a, b, out)
                     : RKMPolyConstruction::ConstructIntersection(p, q, RKMMathPlane(a, b - c, c.AsVector()), out);
    successes += hr == S_OK;
    // Random ends need not cross; only the plane case has a single box to land in.
    ASSERT_TRUE(hr == S_OK ? finite(out) && (!(finite(p) && finite(q) && i % 3 == 2) || InBox(out, {p, q}))
                           : hr == E_FAIL && SameBits(out, kSentinel))
        << "seed " << seed << " case " << i << ": HRESULT " << hr << ", " << Str(out);
  }
  EXPECT_GT(successes, 100);
}

TEST(RKMPolyConstruction, ProjectToBoundingBoxClamps)
{
  const std::uint64_t seed = 0x5eed2008;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-10.0, 10.0);
  for (int i = 0; i < 5000; ++i)
  {
    double lo[3], hi[3];
    for (int k = 0; k < 3; ++k)
    {
      lo[k] = u(rng);
      hi[k] = u(rng);
      if (lo[k] > hi[k])
        std::swap(lo[k], hi[k]);
    }
    lo[i % 3] = i % 10 == 0 ? -kInf : lo[i % 3];
    hi[i % 3] = i % 10 == 1 ? kInf : hi[i % 3];
    const RKMMathBox box(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]);
    const RKMMathPoint p(u(rng) * 1.5, u(rng) * 1.5, u(rng) * 1.5);
    RKMMathPoint r = p, again;
    RKMPolyConstruction::ProjectToBoundingBox(box, r);
    for (int k = 0; k < 3; ++k)
      ASSERT_EQ(r[k], std::min(std::max(p[k], lo[k]), hi[k])) << "seed " << seed << " case " << i << " axis " << k;
    RKMPolyConstruction::ProjectToBoundingBox(box, again = r);
    ASSERT_TRUE(SameBits(again, r));
  }
}
