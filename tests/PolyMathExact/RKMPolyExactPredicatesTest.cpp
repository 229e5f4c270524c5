#include "RKMPolyConstruction.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactPredicates.h"

#include "RKMMathBox.h"
#include "RKMMathPlane.h"
#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMMathVector.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cfloat>
#include <cmath>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <limits>
#include <random>
#include <string>
#include <vector>

namespace
{
constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();
constexpr double kInf = std::numeric_limits<double>::infinity();

std::string Str(const RKMMathPoint &p)
{
  char buf[160];
  std::snprintf(buf, sizeof buf, "(%a, %a, %a)", p.x, p.y, p.z);
  return buf;
}

bool SameBits(const RKMMathPoint &a, const RKMMathPoint &b)
{
  return std::memcmp(&a, &b, sizeof a) == 0;
}

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
  return Cross(a, b, p) == 0 && std::min(a.x, b.x) <= p.x && p.x <= std::max(a.x, b.x) &&
         std::min(a.y, b.y) <= p.y && p.y <= std::max(a.y, b.y);
}

// 0 on some closed edge, otherwise the even-odd parity of a rightward ray (+1 inside, -1 outside).
int OracleClass(const std::vector<IPt> &v, const IPt &p)
{
  const size_t n = v.size();
  for (size_t i = 0; i < n; ++i)
    if (OnSegment(v[i], v[(i + 1) % n], p))
      return 0;
  bool inside = false;
  for (size_t i = 0; i < n; ++i)
  {
    const IPt &a = v[i], &b = v[(i + 1) % n];
    if ((a.y > p.y) != (b.y > p.y))
    {
      const IPt &lo = a.y < b.y ? a : b, &hi = a.y < b.y ? b : a;
      if (Cross(lo, hi, p) > 0)
        inside = !inside;
    }
  }
  return inside ? 1 : -1;
}

int Sign(std::int64_t v)
{
  return v > 0 ? 1 : (v < 0 ? -1 : 0);
}

bool SegmentsIntersect(const IPt &a, const IPt &b, const IPt &c, const IPt &d)
{
  const int o1 = Sign(Cross(a, b, c)), o2 = Sign(Cross(a, b, d));
  const int o3 = Sign(Cross(c, d, a)), o4 = Sign(Cross(c, d, b));
  if (o1 * o2 < 0 && o3 * o4 < 0)
    return true;
  return OnSegment(a, b, c) || OnSegment(a, b, d) || OnSegment(c, d, a) || OnSegment(c, d, b);
}

bool IsSimple(const std::vector<IPt> &v)
{
  const size_t n = v.size();
  if (n < 3)
    return false;
  for (size_t i = 0; i < n; ++i)
    for (size_t j = i + 1; j < n; ++j)
      if (v[i] == v[j])
        return false;
  for (size_t i = 0; i < n; ++i)
  {
    const IPt &a = v[i], &b = v[(i + 1) % n];
    for (size_t j = i + 1; j < n; ++j)
    {
      const IPt &c = v[j], &d = v[(j + 1) % n];
      const bool adjacent = j == i + 1 || (i == 0 && j == n - 1);
      if (adjacent)
      {
        // Neighbours share one vertex; they must not fold back over each other.
        const IPt &x = (j == i + 1) ? a : b;
        const IPt &y = (j == i + 1) ? d : c;
        if (OnSegment(c, d, x) || OnSegment(a, b, y))
          return false;
      }
      else if (SegmentsIntersect(a, b, c, d))
        return false;
    }
  }
  return true;
}

// How the integer coordinates reach the library: as they are, or far from the origin with a tiny
// step, where only the adaptive kernel stays exact.
struct Placement
{
  const char *name;
  RKMPolyExactArithmetic::Mode mode;
  double offset, scale;
};
const Placement kPlacements[] = {
    {"gridded", RKMPolyExactArithmetic::Gridded, 0.0, 1.0},
    {"adaptive", RKMPolyExactArithmetic::Adaptive, 0.0, 1.0},
    {"adaptive2", RKMPolyExactArithmetic::Adaptive2, 0.0, 1.0},
    {"adaptive-shifted", RKMPolyExactArithmetic::Adaptive, 0x1p20, 0x1p-30},
};

RKMMathPoint2D Place(const Placement &pl, const IPt &p)
{
  return RKMMathPoint2D(pl.offset + pl.scale * static_cast<double>(p.x), pl.offset + pl.scale * static_cast<double>(p.y));
}

std::string Describe(const std::vector<IPt> &v, const IPt &p)
{
  std::string s = "polygon";
  for (const IPt &q : v)
    s += " (" + std::to_string(q.x) + "," + std::to_string(q.y) + ")";
  s += " point (" + std::to_string(p.x) + "," + std::to_string(p.y) + ")";
  return s;
}

// Checks one polygon against the oracle at every point of [lo, hi]², in both vertex orders and
// every placement.
void CheckPolygonEverywhere(const std::vector<IPt> &poly, std::int64_t lo, std::int64_t hi, const std::string &tag)
{
  for (int reversed = 0; reversed < 2; ++reversed)
  {
    std::vector<IPt> v = poly;
    if (reversed)
      std::reverse(v.begin(), v.end());
    const int n = static_cast<int>(v.size());
    for (const Placement &pl : kPlacements)
    {
      RKMPolyExactArithmetic arithmetic(pl.mode);
      std::vector<RKMMathPoint2D> placed(n);
      for (int i = 0; i < n; ++i)
        placed[i] = Place(pl, v[i]);
      for (std::int64_t y = lo; y <= hi; ++y)
        for (std::int64_t x = lo; x <= hi; ++x)
        {
          const IPt p{x, y};
          const int expected = OracleClass(v, p);
          int edge = -7;
          const int got = RKMPolyIsInsidePolygon(placed.data(), n, Place(pl, p), arithmetic, &edge);
          ASSERT_EQ(got, expected) << tag << " " << pl.name << " " << Describe(v, p);
          if (got == 0)
          {
            ASSERT_GE(edge, 0) << tag << " " << pl.name << " " << Describe(v, p);
            ASSERT_LT(edge, n) << tag << " " << pl.name << " " << Describe(v, p);
            ASSERT_TRUE(OnSegment(v[edge], v[(edge + 1) % n], p))
                << tag << " " << pl.name << " edge " << edge << " " << Describe(v, p);
          }
          // The class must not depend on whether the edge is asked for.
          ASSERT_EQ(RKMPolyIsInsidePolygon(placed.data(), n, Place(pl, p), arithmetic, nullptr), got);
        }
    }
  }
}
} // namespace

TEST(RKMPolyIsInsidePolygon, EmptyInputIsOutside)
{
  const RKMPolyExactArithmetic a;
  const RKMMathPoint2D v[] = {{0, 0}, {2, 0}, {1, 1}};
  int edge = -7;
  EXPECT_EQ(RKMPolyIsInsidePolygon(v, 0, RKMMathPoint2D(1, 0.5), a, &edge), -1);
  EXPECT_EQ(RKMPolyIsInsidePolygon(v, -3, RKMMathPoint2D(1, 0.5), a, &edge), -1);
  EXPECT_EQ(RKMPolyIsInsidePolygon(nullptr, 3, RKMMathPoint2D(1, 0.5), a, &edge), -1);
  EXPECT_EQ(RKMPolyIsInsidePolygon(v, 3, RKMMathPoint2D(1, 0.5), a, &edge), 1);
}

// A strict peak in y is skipped by the half-open crossing rule and must still count as boundary.
TEST(RKMPolyIsInsidePolygon, PeakVertexIsOnTheBoundary)
{
  CheckPolygonEverywhere({{0, 0}, {2, 0}, {1, 1}}, -1, 3, "triangle");
  for (const auto mode : {RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive})
  {
    const RKMPolyExactArithmetic a(mode);
    const RKMMathPoint2D v[] = {{0, 0}, {2, 0}, {1, 1}};
    int edge = -7;
    EXPECT_EQ(RKMPolyIsInsidePolygon(v, 3, RKMMathPoint2D(1, 1), a, &edge), 0);
    EXPECT_TRUE(edge == 1 || edge == 2) << edge;
  }
}

TEST(RKMPolyIsInsidePolygon, HorizontalEdgesInBothDirections)
{
  const std::vector<IPt> rectangle = {{0, 0}, {4, 0}, {4, 2}, {0, 2}};
  CheckPolygonEverywhere(rectangle, -1, 5, "rectangle");
  // The top edge runs from (4, 2) to (0, 2): its end points and interior are boundary.
  const RKMPolyExactArithmetic a;
  const RKMMathPoint2D v[] = {{0, 0}, {4, 0}, {4, 2}, {0, 2}};
  for (const double x : {4.0, 3.0, 0.5, 0.0})
  {
    int edge = -7;
    EXPECT_EQ(RKMPolyIsInsidePolygon(v, 4, RKMMathPoint2D(x, 2), a, &edge), 0) << x;
    EXPECT_TRUE(edge >= 1 && edge <= 3) << edge;
  }
}

// Every vertex and every edge midpoint of polygons with peaks, valleys, horizontal runs and
// collinear vertices.
TEST(RKMPolyIsInsidePolygon, VertexAndMidpointSweep)
{
  const std::vector<std::vector<IPt>> shapes = {
      {{0, 0}, {12, 0}, {12, 8}, {9, 8}, {9, 2}, {6, 6}, {3, 2}, {3, 8}, {0, 8}},
      {{0, 4}, {4, 0}, {8, 4}, {12, 0}, {12, 10}, {8, 6}, {4, 10}},
      {{0, 0}, {4, 0}, {8, 0}, {8, 4}, {6, 4}, {6, 8}, {2, 8}, {2, 4}, {0, 4}},
      {{2, 0}, {10, 2}, {6, 4}, {12, 8}, {0, 12}, {4, 6}},
  };
  for (const auto &shape : shapes)
  {
    for (int reversed = 0; reversed < 2; ++reversed)
    {
      // Doubled so that every edge midpoint is a lattice point.
      std::vector<IPt> v;
      for (const IPt &q : shape)
        v.push_back({2 * q.x, 2 * q.y});
      if (reversed)
        std::reverse(v.begin(), v.end());
      const int n = static_cast<int>(v.size());
      std::vector<IPt> probes;
      for (int i = 0; i < n; ++i)
      {
        probes.push_back(v[i]);
        const IPt &b = v[(i + 1) % n];
        probes.push_back({(v[i].x + b.x) / 2, (v[i].y + b.y) / 2});
      }
      for (const auto mode : {RKMPolyExactArithmetic::Gridded, RKMPolyExactArithmetic::Adaptive})
      {
        const RKMPolyExactArithmetic a(mode);
        std::vector<RKMMathPoint2D> placed;
        for (const IPt &q : v)
          placed.emplace_back(static_cast<double>(q.x), static_cast<double>(q.y));
        for (const IPt &p : probes)
        {
          int edge = -7;
          ASSERT_EQ(RKMPolyIsInsidePolygon(placed.data(), n, RKMMathPoint2D(p.x, p.y), a, &edge), 0)
              << Describe(v, p);
          ASSERT_TRUE(edge >= 0 && edge < n && OnSegment(v[edge], v[(edge + 1) % n], p))
              << "edge " << edge << " " << Describe(v, p);
        }
      }
    }
  }
}

TEST(RKMPolyIsInsidePolygon, RandomSimplePolygonsMatchOracle)
{
  const std::uint64_t seed = 0x5eed1001;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> count(3, 9), coord(0, 6);
  int tested = 0;
  for (int attempt = 0; tested < 150 && attempt < 200000; ++attempt)
  {
    const int n = count(rng);
    std::vector<IPt> v(n);
    for (IPt &q : v)
      q = {2 * coord(rng), 2 * coord(rng)};
    // Sorting around a centre off the lattice gives a star-shaped candidate most of the time.
    if (attempt % 2 == 0)
    {
      const double cx = 2 * coord(rng) + 0.5, cy = 2 * coord(rng) + 0.25;
      std::sort(v.begin(), v.end(), [cx, cy](const IPt &a, const IPt &b) {
        return std::atan2(a.y - cy, a.x - cx) < std::atan2(b.y - cy, b.x - cx);
      });
    }
    if (!IsSimple(v))
      continue;
    ++tested;
    CheckPolygonEverywhere(v, -1, 13, "seed " + std::to_string(seed) + " attempt " + std::to_string(attempt));
    if (HasFatalFailure())
      return;
  }
  EXPECT_EQ(tested, 150);
}

// Self-intersecting, repeated and degenerate vertex lists follow the even-odd rule.
TEST(RKMPolyIsInsidePolygon, RandomNonSimplePolygonsMatchEvenOddOracle)
{
  const std::uint64_t seed = 0x5eed1002;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> count(1, 9), coord(0, 6);
  for (int iter = 0; iter < 150; ++iter)
  {
    const int n = count(rng);
    std::vector<IPt> v(n);
    for (IPt &q : v)
      q = {2 * coord(rng), 2 * coord(rng)};
    CheckPolygonEverywhere(v, -1, 13, "seed " + std::to_string(seed) + " case " + std::to_string(iter));
    if (HasFatalFailure())
      return;
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
  if (ax > 0)
    return x > 0 ? 1 : -1;
  return 0;
}
} // namespace

TEST(RKMPolyDirectionCodes, MainAxisDirection)
{
  const struct
  {
    RKMMathVector v;
    int code;
  } cases[] = {
      {{1, 0, 0}, 1},   {{-1, 0, 0}, -1}, {{0, 2, 0}, 2},    {{0, -2, 0}, -2},  {{0, 0, 3}, 3},
      {{0, 0, -3}, -3}, {{1, 1, 0}, 1},   {{-1, 1, 0}, -1},  {{1, -1, 0}, 1},   {{0, 1, 1}, 2},
      {{0, -1, 1}, -2}, {{1, 0, 1}, 1},   {{1, 1, 1}, 1},    {{-1, 1, -1}, -1}, {{1, 1, std::nextafter(1.0, 2.0)}, 3},
      {{0, 0, 0}, 0},   {{-0.0, 0, 0}, 0}, {{kNaN, kNaN, kNaN}, 0}, {{1e-310, 0, 0}, 1}, {{0, 0, -1e-310}, -3},
  };
  for (const auto &c : cases)
    EXPECT_EQ(RKMPolyGetMainAxisDirection(c.v), c.code) << c.v.x << " " << c.v.y << " " << c.v.z;

  const std::uint64_t seed = 0x5eed1003;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> small(-2, 2);
  for (int i = 0; i < 3000; ++i)
  {
    const RKMMathVector v(small(rng), small(rng), small(rng));
    ASSERT_EQ(RKMPolyGetMainAxisDirection(v), ReferenceMainAxis(v.x, v.y, v.z))
        << "seed " << seed << " " << v.x << " " << v.y << " " << v.z;
  }
}

TEST(RKMPolyDirectionCodes, MainTriangleDirection)
{
  const RKMMathPoint o(0, 0, 0), x(1, 0, 0), y(0, 1, 0), z(0, 0, 1);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, x, y), 3);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, y, x), -3);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, y, z), 1);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, z, y), -1);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, z, x), 2);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, x, z), -2);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(o, x, RKMMathPoint(2, 0, 0)), 0);
  EXPECT_EQ(RKMPolyGetMainTriangleDirection(x, x, x), 0);

  // Small integers keep the cross product exact, so the reference is the true normal.
  const std::uint64_t seed = 0x5eed1004;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-3, 3);
  for (int i = 0; i < 3000; ++i)
  {
    const std::int64_t p[3][3] = {{c(rng), c(rng), c(rng)}, {c(rng), c(rng), c(rng)}, {c(rng), c(rng), c(rng)}};
    const std::int64_t bx = p[1][0] - p[0][0], by = p[1][1] - p[0][1], bz = p[1][2] - p[0][2];
    const std::int64_t cx = p[2][0] - p[0][0], cy = p[2][1] - p[0][1], cz = p[2][2] - p[0][2];
    const int expected =
        ReferenceMainAxis(double(by * cz - bz * cy), double(bz * cx - bx * cz), double(bx * cy - by * cx));
    const RKMMathPoint a(p[0][0], p[0][1], p[0][2]), b(p[1][0], p[1][1], p[1][2]), cc(p[2][0], p[2][1], p[2][2]);
    ASSERT_EQ(RKMPolyGetMainTriangleDirection(a, b, cc), expected) << "seed " << seed << " case " << i;
  }
}

TEST(RKMPolyDirectionCodes, ProjectOntoCartesianPlaneTable)
{
  const RKMMathPoint p(1, 2, 3);
  const struct
  {
    int code;
    double u, v;
  } table[] = {{1, 2, 3}, {-1, 3, 2}, {2, 3, 1}, {-2, 1, 3}, {3, 1, 2}, {-3, 2, 1}};
  for (const auto &t : table)
  {
    RKMMathPoint2D q(-9, -9);
    EXPECT_EQ(RKMPolyProjectOntoCartesianPlane(t.code, p, q), S_OK);
    EXPECT_EQ(q.x, t.u) << t.code;
    EXPECT_EQ(q.y, t.v) << t.code;
  }
  for (const int bad : {0, 4, -4, 7, -100})
  {
    RKMMathPoint2D q(-9, -8);
    EXPECT_EQ(RKMPolyProjectOntoCartesianPlane(bad, p, q), S_FALSE) << bad;
    EXPECT_EQ(q.x, -9.0);
    EXPECT_EQ(q.y, -8.0);
  }
}

// Projecting along the triangle's own code must give a counter-clockwise triangle.
TEST(RKMPolyDirectionCodes, ProjectionAlongMainDirectionIsCounterClockwise)
{
  const RKMPolyExactArithmetic exact(RKMPolyExactArithmetic::Adaptive);
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

TEST(RKMPolyDirectionCodes, SegmentDirectionAndAxisProjection)
{
  const RKMMathPoint2D o(0, 0);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(3, 1)), 1);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(-3, 1)), -1);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(1, 3)), 2);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(1, -3)), -2);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(2, 2)), 1);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(-2, 2)), -1);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(o, RKMMathPoint2D(-2, -2)), -1);
  EXPECT_EQ(RKMPolyGetMainSegmentDirection(RKMMathPoint2D(5, 7), RKMMathPoint2D(5, 7)), 0);

  const RKMMathPoint2D p(3, -5);
  EXPECT_EQ(RKMPolyProjectOnAxis(p, 1), 3.0);
  EXPECT_EQ(RKMPolyProjectOnAxis(p, -1), -3.0);
  EXPECT_EQ(RKMPolyProjectOnAxis(p, 2), -5.0);
  EXPECT_EQ(RKMPolyProjectOnAxis(p, -2), 5.0);
  for (const int bad : {0, 3, -3, 9})
    EXPECT_EQ(RKMPolyProjectOnAxis(p, bad), 0.0) << bad;

  // Along its own code, the segment advances by at least its extent on the other axis.
  const std::uint64_t seed = 0x5eed1006;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-3, 3);
  for (int i = 0; i < 3000; ++i)
  {
    const RKMMathPoint2D a(c(rng), c(rng)), b(c(rng), c(rng));
    const int code = RKMPolyGetMainSegmentDirection(a, b);
    SCOPED_TRACE(testing::Message() << "seed " << seed << " case " << i);
    if (a == b)
    {
      ASSERT_EQ(code, 0);
      continue;
    }
    ASSERT_TRUE(code == 1 || code == -1 || code == 2 || code == -2) << code;
    const double along = RKMPolyProjectOnAxis(b, code) - RKMPolyProjectOnAxis(a, code);
    const double across = std::abs(code) == 1 ? std::fabs(b.y - a.y) : std::fabs(b.x - a.x);
    ASSERT_GT(along, 0.0);
    ASSERT_GE(along, across);
    if (along == across)
    {
      ASSERT_EQ(std::abs(code), 1) << "ties go to x";
    }
  }
}

namespace
{
bool CollinearI(const std::int64_t *a, const std::int64_t *b, const std::int64_t *c)
{
  const __int128 bx = b[0] - a[0], by = b[1] - a[1], bz = b[2] - a[2];
  const __int128 cx = c[0] - a[0], cy = c[1] - a[1], cz = c[2] - a[2];
  return by * cz - bz * cy == 0 && bz * cx - bx * cz == 0 && bx * cy - by * cx == 0;
}
} // namespace

TEST(RKMPolyExactPredicates, ColinearOnGridPoints)
{
  const RKMPolyExactArithmetic arithmetic;
  const RKMPolyExactPredicates predicates(arithmetic);
  EXPECT_EQ(predicates.AreColinear(RKMMathPoint(0, 0, 0), RKMMathPoint(1, 1, 1), RKMMathPoint(2, 2, 2)), 1);
  EXPECT_EQ(predicates.AreColinear(RKMMathPoint(0, 0, 0), RKMMathPoint(1, 1, 1), RKMMathPoint(2, 2, 2.03125)), 0);
  EXPECT_EQ(predicates.AreColinear(RKMMathPoint(1, 2, 3), RKMMathPoint(1, 2, 3), RKMMathPoint(7, -2, 0)), 1);
  // Collinear in the xy projection only.
  EXPECT_EQ(predicates.AreColinear(RKMMathPoint(0, 0, 0), RKMMathPoint(1, 1, 0), RKMMathPoint(2, 2, 5)), 0);

  // Integers in units of the default grid step 1/32, up to the grid bound.
  const std::uint64_t seed = 0x5eed1007;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<std::int64_t> coord(-(1 << 21), 1 << 21), dir(-300, 300), mult(-6, 6);
  std::uniform_int_distribution<int> kind(0, 3), axis(0, 2);
  int collinear = 0;
  for (int i = 0; i < 20000; ++i)
  {
    std::int64_t p[3][3];
    for (auto &q : p)
      for (auto &c : q)
        c = coord(rng);
    const int k = kind(rng);
    if (k != 0)
    {
      const std::int64_t d[3] = {dir(rng), dir(rng), dir(rng)};
      const std::int64_t s = mult(rng), t = mult(rng);
      for (int j = 0; j < 3; ++j)
      {
        p[1][j] = p[0][j] + s * d[j];
        p[2][j] = p[0][j] + t * d[j];
      }
      if (k == 2)
        p[2][axis(rng)] += rng() & 1 ? 1 : -1;
      if (k == 3)
        p[2][axis(rng)] += d[axis(rng)];
    }
    const bool expected = CollinearI(p[0], p[1], p[2]);
    collinear += expected;
    RKMMathPoint q[3];
    for (int j = 0; j < 3; ++j)
      q[j] = RKMMathPoint(p[j][0] / 32.0, p[j][1] / 32.0, p[j][2] / 32.0);
    ASSERT_EQ(predicates.AreColinear(q[0], q[1], q[2]), expected ? 1 : 0)
        << "seed " << seed << " case " << i << " " << Str(q[0]) << Str(q[1]) << Str(q[2]);
  }
  EXPECT_GT(collinear, 3000);
}

// Points of [1, 2)³ are integers in units of 2^-52, so the oracle stays exact in 128 bits.
TEST(RKMPolyExactPredicates, ColinearAdaptiveNearlyCollinearDoubles)
{
  const RKMPolyExactArithmetic arithmetic(RKMPolyExactArithmetic::Adaptive);
  const RKMPolyExactPredicates predicates(arithmetic);
  const std::uint64_t seed = 0x5eed1008;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(1.25, 1.75), t(0.0, 1.0);
  std::uniform_int_distribution<std::int64_t> step(-(1 << 20), 1 << 20);
  int collinear = 0, tested = 0;
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
    std::int64_t p[3][3];
    const RKMMathPoint *pts[3] = {&a, &b, &c};
    bool representable = true;
    for (int j = 0; j < 3; ++j)
      for (int k = 0; k < 3; ++k)
      {
        const double v = (*pts[j])[k];
        representable = representable && v >= 1.0 && v < 2.0;
        p[j][k] = static_cast<std::int64_t>(std::ldexp(v, 52));
      }
    if (!representable)
      continue;
    ++tested;
    const bool expected = CollinearI(p[0], p[1], p[2]);
    collinear += expected;
    ASSERT_EQ(predicates.AreColinear(a, b, c), expected ? 1 : 0)
        << "seed " << seed << " case " << i << " " << Str(a) << Str(b) << Str(c);
  }
  EXPECT_GT(tested, 15000);
  EXPECT_GT(collinear, 2000);
}

namespace
{
struct LPoint
{
  long double x, y, z;
};
LPoint L(const RKMMathPoint &p)
{
  return {p.x, p.y, p.z};
}
LPoint Sub(const LPoint &a, const LPoint &b)
{
  return {a.x - b.x, a.y - b.y, a.z - b.z};
}
LPoint CrossL(const LPoint &a, const LPoint &b)
{
  return {a.y * b.z - a.z * b.y, a.z * b.x - a.x * b.z, a.x * b.y - a.y * b.x};
}
long double DotL(const LPoint &a, const LPoint &b)
{
  return a.x * b.x + a.y * b.y + a.z * b.z;
}
LPoint Lerp(const LPoint &a, const LPoint &b, long double t)
{
  return {a.x + t * (b.x - a.x), a.y + t * (b.y - a.y), a.z + t * (b.z - a.z)};
}
long double Norm(const LPoint &a)
{
  return std::sqrt(DotL(a, a));
}

RKMMathVector RandomVector(std::mt19937_64 &rng, double r)
{
  std::uniform_real_distribution<double> u(-r, r);
  return RKMMathVector(u(rng), u(rng), u(rng));
}

bool InBox(const RKMMathPoint &p, const RKMMathPoint &a, const RKMMathPoint &b)
{
  for (int k = 0; k < 3; ++k)
    if (!(p[k] >= std::min(a[k], b[k]) && p[k] <= std::max(a[k], b[k])))
      return false;
  return true;
}

bool InBox(const RKMMathPoint &p, const RKMMathPoint &a, const RKMMathPoint &b, const RKMMathPoint &c)
{
  for (int k = 0; k < 3; ++k)
    if (!(p[k] >= std::min({a[k], b[k], c[k]}) && p[k] <= std::max({a[k], b[k], c[k]})))
      return false;
  return true;
}

::testing::AssertionResult Near(const RKMMathPoint &got, const LPoint &expected, long double tol)
{
  const long double d = std::max({std::fabs(got.x - expected.x), std::fabs(got.y - expected.y),
                                  std::fabs(got.z - expected.z)});
  if (d <= tol)
    return ::testing::AssertionSuccess();
  return ::testing::AssertionFailure() << Str(got) << " is " << static_cast<double>(d) << " away from ("
                                       << static_cast<double>(expected.x) << ", " << static_cast<double>(expected.y)
                                       << ", " << static_cast<double>(expected.z) << ")";
}

const RKMMathPoint kSentinel(7.25, -7.5, 7.75);
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
    const LPoint n = CrossL(Sub(L(b), L(a)), Sub(L(c), L(a)));
    if (Norm(n) < 0.05 * scale * scale)
      continue;
    const double w0 = w(rng), w1 = w(rng), w2 = w(rng), ws = w0 + w1 + w2;
    const RKMMathPoint x((w0 * a.x + w1 * b.x + w2 * c.x) / ws, (w0 * a.y + w1 * b.y + w2 * c.y) / ws,
                         (w0 * a.z + w1 * b.z + w2 * c.z) / ws);
    RKMMathVector v = RandomVector(rng, 1.0);
    if (v.Normalize() != S_OK)
      continue;
    const LPoint vl{v.x, v.y, v.z};
    if (std::fabs(DotL(vl, n)) < 0.2L * Norm(n))
      continue;
    const RKMMathPoint p = x + v * (len(rng) * scale), q = x - v * (len(rng) * scale);

    const long double d0 = DotL(Sub(L(p), L(a)), n), d1 = DotL(Sub(L(q), L(a)), n);
    const LPoint expected = Lerp(L(p), L(q), d0 / (d0 - d1));

    RKMMathPoint out = kSentinel;
    ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(p, q, a, b, c, out), S_OK) << "seed " << seed << " case " << i;
    ++tested;
    ASSERT_TRUE(InBox(out, p, q)) << "seed " << seed << " case " << i << " " << Str(out);
    ASSERT_TRUE(InBox(out, a, b, c)) << "seed " << seed << " case " << i << " " << Str(out);
    ASSERT_TRUE(Near(out, expected, 1e-10L * 30 * scale)) << "seed " << seed << " case " << i;
  }
  EXPECT_GT(tested, 5000);
}

// An end that lies on the plane exactly is the intersection, and must come back unchanged.
TEST(RKMPolyConstruction, SegmentTriangleEndOnThePlane)
{
  const std::uint64_t seed = 0x5eed2002;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-50, 50);
  int tested = 0;
  for (int i = 0; i < 5000; ++i)
  {
    const RKMMathPoint a(c(rng), c(rng), c(rng)), b(c(rng), c(rng), c(rng)), cc(c(rng), c(rng), c(rng));
    const RKMMathVector n = (b - a) ^ (cc - a);
    if (n == RKMMathVector())
      continue;
    // Dyadic combinations of the vertices keep every product exact, so the distance is exactly 0.
    const RKMMathPoint p = i % 3 == 0 ? a
                                      : RKMMathPoint((a.x + b.x + 2 * cc.x) / 4, (a.y + b.y + 2 * cc.y) / 4,
                                                     (a.z + b.z + 2 * cc.z) / 4);
    const RKMMathPoint q = p + RKMMathVector(c(rng), c(rng), c(rng));
    if ((q - a) * n == 0.0)
      continue;
    ++tested;
    RKMMathPoint out = kSentinel;
    ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(p, q, a, b, cc, out), S_OK);
    ASSERT_TRUE(SameBits(out, p)) << "seed " << seed << " case " << i << " got " << Str(out) << " want " << Str(p);
  }
  EXPECT_GT(tested, 4000);
}

TEST(RKMPolyConstruction, SegmentTriangleFailures)
{
  const RKMMathPoint a(0, 0, 0), b(4, 0, 0), c(0, 4, 0);
  RKMMathPoint out = kSentinel;
  // Both ends on the plane.
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(1, 1, 0), RKMMathPoint(2, 1, 0), a, b, c, out),
            E_FAIL);
  EXPECT_TRUE(SameBits(out, kSentinel));
  // A degenerate triangle has no plane.
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(1, 1, -1), RKMMathPoint(1, 1, 1), a, b,
                                                       RKMMathPoint(8, 0, 0), out),
            E_FAIL);
  EXPECT_TRUE(SameBits(out, kSentinel));
  const RKMMathPoint p(1, 1, -1), q(1, 1, 1);
  for (const double bad : {kNaN, kInf, -kInf})
  {
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(bad, 1, -1), q, a, b, c, out), E_FAIL) << bad;
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p, RKMMathPoint(1, 1, bad), a, b, c, out), E_FAIL) << bad;
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p, q, RKMMathPoint(0, bad, 0), b, c, out), E_FAIL) << bad;
    EXPECT_TRUE(SameBits(out, kSentinel));
  }
  // A normal whose plain cross product would overflow still gives the crossing.
  const double big = 1e200;
  RKMMathPoint far = kSentinel;
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(big, big, -big), RKMMathPoint(big, big, big),
                                                       a, RKMMathPoint(4 * big, 0, 0), RKMMathPoint(0, 4 * big, 0),
                                                       far),
            S_OK);
  EXPECT_TRUE(SameBits(far, RKMMathPoint(big, big, 0)));

  RKMMathPoint good = kSentinel;
  ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(p, q, a, b, c, good), S_OK);
  EXPECT_EQ(good, RKMMathPoint(1, 1, 0));
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
    const LPoint d0 = Sub(L(p1), L(p0)), d1 = Sub(L(q1), L(q0)), r = Sub(L(q0), L(p0));
    const long double aa = DotL(d0, d0), bb = DotL(d0, d1), cc = DotL(d1, d1), dd = DotL(d0, r), ee = DotL(d1, r);
    const long double t = (bb * dd - aa * ee) / (aa * cc - bb * bb);
    const LPoint expected = Lerp(L(q0), L(q1), t);

    RKMMathPoint out = kSentinel;
    ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p1, q0, q1, out), S_OK)
        << "seed " << seed << " case " << i;
    ++tested;
    ASSERT_TRUE(InBox(out, p0, p1)) << "seed " << seed << " case " << i << " " << Str(out);
    ASSERT_TRUE(InBox(out, q0, q1)) << "seed " << seed << " case " << i << " " << Str(out);
    ASSERT_TRUE(Near(out, expected, 1e-10L * 30 * scale)) << "seed " << seed << " case " << i;
  }
  EXPECT_GT(tested, 3000);
}

TEST(RKMPolyConstruction, CoplanarSegmentsEndOnTheOther)
{
  RKMMathPoint out = kSentinel;
  ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(0, 0, 0), RKMMathPoint(4, 0, 0),
                                                       RKMMathPoint(1, 0, 0), RKMMathPoint(1, 3, 0), out),
            S_OK);
  EXPECT_EQ(out, RKMMathPoint(1, 0, 0));

  const std::uint64_t seed = 0x5eed2004;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> c(-50, 50);
  int tested = 0;
  for (int i = 0; i < 5000; ++i)
  {
    const RKMMathPoint p0(c(rng), c(rng), c(rng)), p1(c(rng), c(rng), c(rng));
    // q0 at a dyadic point of p0p1, so that its side test is exactly 0.
    const RKMMathPoint q0 = i % 2 ? RKMMathPoint((p0.x + p1.x) / 2, (p0.y + p1.y) / 2, (p0.z + p1.z) / 2)
                                  : RKMMathPoint((3 * p0.x + p1.x) / 4, (3 * p0.y + p1.y) / 4, (3 * p0.z + p1.z) / 4);
    const RKMMathPoint q1 = q0 + RKMMathVector(c(rng), c(rng), c(rng));
    if (((p1 - p0) ^ (q1 - q0)) == RKMMathVector())
      continue;
    ++tested;
    out = kSentinel;
    ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p1, q0, q1, out), S_OK);
    ASSERT_TRUE(SameBits(out, q0)) << "seed " << seed << " case " << i << " got " << Str(out) << " want " << Str(q0);
  }
  EXPECT_GT(tested, 4000);
}

TEST(RKMPolyConstruction, CoplanarSegmentsFailures)
{
  RKMMathPoint out = kSentinel;
  const RKMMathPoint p0(0, 0, 0), p1(4, 0, 0);
  // Parallel, collinear overlapping, and a null segment.
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p1, RKMMathPoint(0, 1, 0), RKMMathPoint(4, 1, 0), out),
            E_FAIL);
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p1, RKMMathPoint(1, 0, 0), RKMMathPoint(3, 0, 0), out),
            E_FAIL);
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p1, RKMMathPoint(1, 1, 0), RKMMathPoint(1, 1, 0), out),
            E_FAIL);
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p0, RKMMathPoint(1, 1, 0), RKMMathPoint(1, -1, 0), out),
            E_FAIL);
  EXPECT_TRUE(SameBits(out, kSentinel));
  for (const double bad : {kNaN, kInf})
  {
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p0, RKMMathPoint(4, bad, 0), RKMMathPoint(1, 1, 0),
                                                         RKMMathPoint(1, -1, 0), out),
              E_FAIL)
        << bad;
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(p0, p1, RKMMathPoint(1, 1, 0), RKMMathPoint(bad, -1, 0), out),
              E_FAIL)
        << bad;
    EXPECT_TRUE(SameBits(out, kSentinel));
  }
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
    const LPoint nl = CrossL({u.x, u.y, u.z}, {v.x, v.y, v.z});
    if (Norm(nl) < 0.1)
      continue;
    const RKMMathPoint o = RKMMathPoint(RandomVector(rng, 10 * scale));
    const RKMMathPlane plane(o, u, v);
    RKMMathVector w = RandomVector(rng, 1.0);
    if (w.Normalize() != S_OK)
      continue;
    if (std::fabs(DotL({w.x, w.y, w.z}, nl)) < 0.2L * Norm(nl))
      continue;
    const RKMMathPoint x = o + u * (coef(rng) * scale) + v * (coef(rng) * scale);
    const RKMMathPoint p = x + w * (len(rng) * scale), q = x - w * (len(rng) * scale);

    const long double d0 = DotL(Sub(L(p), L(o)), nl), d1 = DotL(Sub(L(q), L(o)), nl);
    const LPoint expected = Lerp(L(p), L(q), d0 / (d0 - d1));

    RKMMathPoint pq = kSentinel, qp = kSentinel;
    ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(p, q, plane, pq), S_OK) << "seed " << seed << " case " << i;
    ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(q, p, plane, qp), S_OK) << "seed " << seed << " case " << i;
    ++tested;
    ASSERT_TRUE(SameBits(pq, qp)) << "seed " << seed << " case " << i << " " << Str(pq) << " vs " << Str(qp);
    ASSERT_TRUE(InBox(pq, p, q)) << "seed " << seed << " case " << i << " " << Str(pq);
    ASSERT_TRUE(Near(pq, expected, 1e-10L * 30 * scale)) << "seed " << seed << " case " << i;
  }
  EXPECT_GT(tested, 5000);
}

// Axis-aligned planes make the distance of an end on the plane exactly 0, whichever order the ends
// are given in.
TEST(RKMPolyConstruction, SegmentPlaneEndOnThePlane)
{
  const std::uint64_t seed = 0x5eed2006;
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> u(-10.0, 10.0);
  const RKMMathVector axes[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
  int mismatches = 0;
  std::string first;
  for (int i = 0; i < 3000; ++i)
  {
    const int k = i % 3;
    const RKMMathPoint o(u(rng), u(rng), u(rng));
    const RKMMathPlane plane(o, axes[(k + 1) % 3], axes[(k + 2) % 3]);
    RKMMathPoint p(u(rng), u(rng), u(rng));
    p[k] = o[k];
    RKMMathPoint q(u(rng), u(rng), u(rng));
    if (q[k] == o[k])
      continue;
    for (int order = 0; order < 2; ++order)
    {
      RKMMathPoint out = kSentinel;
      const HRESULT hr = order ? RKMPolyConstruction::ConstructIntersection(q, p, plane, out)
                               : RKMPolyConstruction::ConstructIntersection(p, q, plane, out);
      ASSERT_EQ(hr, S_OK);
      if (!SameBits(out, p) && mismatches++ == 0)
        first = "case " + std::to_string(i) + " p " + Str(p) + " q " + Str(q) + " got " + Str(out);
    }
  }
  // Rebuilding the far end as q + (p − q)·1 would round away from p.
  EXPECT_EQ(mismatches, 0) << "end on the plane not returned exactly (seed " << seed << "), first: " << first;
}

TEST(RKMPolyConstruction, SegmentPlaneFailures)
{
  const RKMMathPlane plane; // z = 0
  RKMMathPoint out = kSentinel;
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(1, 2, 0), RKMMathPoint(3, -4, 0), plane, out),
            E_FAIL);
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(1, 2, 0), RKMMathPoint(1, 2, 0), plane, out),
            E_FAIL);
  const RKMMathPlane degenerate(RKMMathPoint(0, 0, 0), RKMMathVector(1, 0, 0), RKMMathVector(2, 0, 0));
  EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(0, 0, -1), RKMMathPoint(0, 0, 1), degenerate, out),
            E_FAIL);
  for (const double bad : {kNaN, kInf, -kInf})
  {
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(0, 0, bad), RKMMathPoint(0, 0, 1), plane, out),
              E_FAIL)
        << bad;
    EXPECT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(bad, 0, -1), RKMMathPoint(0, 0, 1), plane, out),
              E_FAIL)
        << bad;
  }
  EXPECT_EQ(
      RKMPolyConstruction::ConstructIntersection(RKMMathPoint(0, 0, -DBL_MAX), RKMMathPoint(0, 0, DBL_MAX), plane, out),
      E_FAIL);
  EXPECT_TRUE(SameBits(out, kSentinel));

  ASSERT_EQ(RKMPolyConstruction::ConstructIntersection(RKMMathPoint(2, 2, -1), RKMMathPoint(4, 2, 3), plane, out),
            S_OK);
  EXPECT_EQ(out, RKMMathPoint(2.5, 2, 0));
}

// Whatever the input, a success carries a finite point and a failure leaves out alone.
TEST(RKMPolyConstruction, HostileInputsNeverYieldNaN)
{
  const std::uint64_t seed = 0x5eed2007;
  std::mt19937_64 rng(seed);
  std::uniform_int_distribution<int> pick(0, 15);
  std::uniform_real_distribution<double> u(-10.0, 10.0);
  auto value = [&]() -> double {
    switch (pick(rng))
    {
    case 0:
      return kNaN;
    case 1:
      return kInf;
    case 2:
      return -kInf;
    case 3:
      return DBL_MAX;
    case 4:
      return -1e300;
    case 5:
      return 1e160;
    case 6:
      return 1e-300;
    case 7:
      return 0.0;
    default:
      return u(rng);
    }
  };
  auto point = [&] { return RKMMathPoint(value(), value(), value()); };
  auto finite = [](const RKMMathPoint &p) { return std::isfinite(p.x) && std::isfinite(p.y) && std::isfinite(p.z); };
  int successes = 0;
  for (int i = 0; i < 30000; ++i)
  {
    const RKMMathPoint p = point(), q = point(), a = point(), b = point(), c = point();
    SCOPED_TRACE(testing::Message() << "seed " << seed << " case " << i);
    RKMMathPoint out = kSentinel;
    HRESULT hr;
    switch (i % 3)
    {
    case 0:
      hr = RKMPolyConstruction::ConstructIntersection(p, q, a, b, c, out);
      break;
    case 1:
      hr = RKMPolyConstruction::ConstructIntersection(p, q, a, b, out);
      break;
    default:
      hr = RKMPolyConstruction::ConstructIntersection(p, q, RKMMathPlane(a, b - c, c.AsVector()), out);
      break;
    }
    ASSERT_TRUE(hr == S_OK || hr == E_FAIL) << hr;
    if (hr == S_OK)
    {
      ++successes;
      ASSERT_TRUE(finite(out)) << Str(out);
      // Random ends need not cross; only the plane case has a single box to land in.
      if (finite(p) && finite(q) && i % 3 == 2)
      {
        ASSERT_TRUE(InBox(out, p, q)) << Str(out);
      }
    }
    else
      ASSERT_TRUE(SameBits(out, kSentinel)) << Str(out);
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
    if (i % 10 == 0)
      lo[i % 3] = -kInf;
    if (i % 10 == 1)
      hi[i % 3] = kInf;
    const RKMMathBox box(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]);
    const RKMMathPoint p(u(rng) * 1.5, u(rng) * 1.5, u(rng) * 1.5);
    RKMMathPoint r = p;
    RKMPolyConstruction::ProjectToBoundingBox(box, r);
    for (int k = 0; k < 3; ++k)
      ASSERT_EQ(r[k], std::min(std::max(p[k], lo[k]), hi[k])) << "seed " << seed << " case " << i << " axis " << k;
    RKMMathPoint again = r;
    RKMPolyConstruction::ProjectToBoundingBox(box, again);
    ASSERT_TRUE(SameBits(again, r));
  }
}
