#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"

#include <gmpxx.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <climits>
#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <limits>
#include <random>
#include <sstream>
#include <string>
#include <utility>
#include <vector>

namespace
{
using Arith = RKMPolyExactArithmetic;
using Mode = RKMPolyExactArithmetic::Mode;
constexpr Mode kAdaptiveModes[] = {Arith::Adaptive, Arith::Adaptive2};

// Sanitized and unoptimised builds run the same generators on fewer cases; RKM_EXACT_TEST_SCALE
// multiplies the counts for a longer hunt.
double CountScale()
{
  static const double scale = []
  {
    double s = 1.0;
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
    s = 0.1;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer) || __has_feature(memory_sanitizer)
    s = 0.1;
#endif
#endif
#ifndef NDEBUG
    s = std::min(s, 0.2);
#endif
    if (const char *env = std::getenv("RKM_EXACT_TEST_SCALE"))
      if (const double f = std::atof(env); f > 0.0)
        s *= f;
    return s;
  }();
  return scale;
}

long Count(long normal) { return std::max(1L, std::lround(static_cast<double>(normal) * CountScale())); }

// Deterministic on every standard library, unlike the std distributions.
class Rng
{
public:
  explicit Rng(std::uint64_t seed) : m_engine(seed) {}
  std::int64_t Int(std::int64_t lo, std::int64_t hi)
  {
    return lo + static_cast<std::int64_t>(m_engine() % (static_cast<std::uint64_t>(hi - lo) + 1));
  }
  double Unit() { return static_cast<double>(m_engine() >> 11) * 0x1p-53; }
  double Symmetric() { return 2.0 * Unit() - 1.0; }
  double Sign() { return (m_engine() & 1) ? 1.0 : -1.0; }
  bool OneIn(int n) { return Int(0, n - 1) == 0; }
  double Pow2(int lo, int hi) { return std::ldexp(1.0, static_cast<int>(Int(lo, hi))); }

private:
  std::mt19937_64 m_engine;
};

enum class Predicate
{
  Orientation2D,
  Orientation3D,
  InCircle
};
constexpr Predicate kPredicates[] = {Predicate::Orientation2D, Predicate::Orientation3D, Predicate::InCircle};

const char *Name(Predicate p)
{
  return p == Predicate::Orientation2D ? "Orientation2D" : p == Predicate::Orientation3D ? "Orientation3D" : "InCircle";
}
int Dimension(Predicate p) { return p == Predicate::Orientation3D ? 3 : 2; }
int PointCount(Predicate p) { return p == Predicate::Orientation2D ? 3 : 4; }

// Up to four points of up to three coordinates; what a predicate does not read stays zero.
template <class T> using Points = std::array<std::array<T, 3>, 4>;
using Case = Points<double>;
using GridPoints = Points<std::int64_t>;

template <class T> int Sign(const T &v) { return (v > 0) - (v < 0); }

// The determinants written plainly: exact over integers or mpz, and the naive floating-point
// evaluation over float or double, which tells which cases are hard.
template <class T> int Reference(Predicate p, const Points<T> &v)
{
  switch (p)
  {
  case Predicate::Orientation2D:
  {
    const T det = (v[0][0] - v[2][0]) * (v[1][1] - v[2][1]) - (v[1][0] - v[2][0]) * (v[0][1] - v[2][1]);
    return Sign(det);
  }
  case Predicate::Orientation3D:
  {
    const T bx = v[1][0] - v[0][0], by = v[1][1] - v[0][1], bz = v[1][2] - v[0][2];
    const T cx = v[2][0] - v[0][0], cy = v[2][1] - v[0][1], cz = v[2][2] - v[0][2];
    const T dx = v[3][0] - v[0][0], dy = v[3][1] - v[0][1], dz = v[3][2] - v[0][2];
    const T det = (by * cz - bz * cy) * dx + (bz * cx - bx * cz) * dy + (bx * cy - by * cx) * dz;
    return Sign(det);
  }
  case Predicate::InCircle:
  {
    // Rows (x, y, x² + y²) of a, b, c relative to d: positive for d inside when a, b, c turn
    // counter-clockwise. Collinear a, b, c keep the raw sign.
    const T ax = v[0][0] - v[3][0], ay = v[0][1] - v[3][1];
    const T bx = v[1][0] - v[3][0], by = v[1][1] - v[3][1];
    const T cx = v[2][0] - v[3][0], cy = v[2][1] - v[3][1];
    const T al = ax * ax + ay * ay, bl = bx * bx + by * by, cl = cx * cx + cy * cy;
    const T det = ax * (by * cl - bl * cy) - ay * (bx * cl - bl * cx) + al * (bx * cy - by * cx);
    return Reference(Predicate::Orientation2D, v) < 0 ? -Sign(det) : Sign(det);
  }
  }
  return 0;
}

template <class T, class U> Points<T> Convert(const Points<U> &in)
{
  Points<T> out{};
  for (int i = 0; i < 4; ++i)
    for (int k = 0; k < 3; ++k)
      out[i][k] = static_cast<T>(in[i][k]);
  return out;
}

// Exact signs over doubles: one common power-of-two scaling turns every coordinate into an integer
// and keeps the sign of each (homogeneous, translation-invariant) determinant.
int ExactSign(Predicate p, const Case &c)
{
  static Points<mpz_class> z;
  int low = INT_MAX;
  for (const auto &point : c)
    for (const double v : point)
      if (v != 0.0)
      {
        int e;
        std::frexp(v, &e);
        low = std::min(low, e - 53);
      }
  for (int i = 0; i < 4; ++i)
    for (int k = 0; k < 3; ++k)
    {
      int e;
      const double f = std::frexp(c[i][k], &e);
      z[i][k] = static_cast<long>(std::ldexp(f, 53));
      if (f != 0.0)
        mpz_mul_2exp(z[i][k].get_mpz_t(), z[i][k].get_mpz_t(), static_cast<mp_bitcnt_t>(e - 53 - low));
    }
  return Reference(p, z);
}

int LibrarySign(const Arith &arith, Predicate p, const Case &c)
{
  switch (p)
  {
  case Predicate::Orientation2D:
    return arith.Orientation2D(c[0].data(), c[1].data(), c[2].data());
  case Predicate::Orientation3D:
    return arith.Orientation3D(c[0].data(), c[1].data(), c[2].data(), c[3].data());
  case Predicate::InCircle:
    return arith.InCircle({c[0][0], c[0][1]}, {c[1][0], c[1][1]}, {c[2][0], c[2][1]}, {c[3][0], c[3][1]});
  }
  return 2;
}

const char *ModeName(Mode m)
{
  return m == Arith::Gridded     ? "Gridded"
         : m == Arith::Adaptive  ? "Adaptive"
         : m == Arith::Adaptive2 ? "Adaptive2"
                                 : "other";
}

std::string Format(Predicate p, const Case &c)
{
  std::ostringstream s;
  s << std::hexfloat;
  for (int i = 0; i < PointCount(p); ++i)
  {
    s << (i ? " (" : "(") << c[i][0] << ", " << c[i][1];
    if (Dimension(p) == 3)
      s << ", " << c[i][2];
    s << ")";
  }
  return s.str();
}

// Counts disagreements, printing the first few in full (hex floats reproduce the inputs exactly),
// and fails once at the end with the total.
class Tally
{
public:
  Tally(Predicate p, std::string context) : m_predicate(p), m_context(std::move(context)) {}
  ~Tally() { EXPECT_EQ(m_mismatches, 0) << m_context << ": mismatches over " << m_checks << " checks"; }
  void Check(int expected, int got, const Case &c, const char *what)
  {
    ++m_checks;
    if (expected != got && ++m_mismatches <= 5)
      ADD_FAILURE() << m_context << ", " << what << ": expected " << expected << ", got " << got << " for "
                    << Name(m_predicate) << Format(m_predicate, c);
  }
  long Checks() const { return m_checks; }

private:
  Predicate m_predicate;
  std::string m_context;
  long m_checks = 0;
  long m_mismatches = 0;
};

std::string Context(Predicate p, const char *generator, const std::string &domain, std::uint64_t seed)
{
  std::ostringstream s;
  s << Name(p) << ", " << generator << ", " << domain << ", seed " << seed;
  return s.str();
}

double Nudge(double v, int ulps)
{
  for (; ulps > 0; --ulps)
    v = std::nextafter(v, std::numeric_limits<double>::infinity());
  for (; ulps < 0; ++ulps)
    v = std::nextafter(v, -std::numeric_limits<double>::infinity());
  return v;
}

// Grid coordinates are handled in grid units of 2ε.
constexpr std::int64_t kGridMax = std::int64_t(1) << 22;

std::int64_t ClampToGrid(std::int64_t k) { return std::clamp(k, -kGridMax, kGridMax); }

// base + Σ m·v over `span` random directions with small integer multipliers: exactly collinear
// (span 1), coplanar (span 2) or coincident (span 0). The base is drawn where every point stays in
// range, so large coordinates come with long and short directions alike.
bool SpannedGridPoints(Rng &rng, int dim, int count, int span, GridPoints &out)
{
  std::int64_t dir[2][3] = {}, mult[4][2] = {};
  const std::int64_t reach = std::int64_t(1) << rng.Int(0, 21);
  for (int s = 0; s < span; ++s)
    for (int k = 0; k < dim; ++k)
      dir[s][k] = rng.Int(-reach, reach);
  for (int i = 1; i < count; ++i)
    for (int s = 0; s < span; ++s)
      mult[i][s] = rng.Int(-3, 3);
  out = {};
  for (int k = 0; k < dim; ++k)
  {
    std::int64_t lo = -kGridMax, hi = kGridMax, offset[4] = {};
    for (int i = 0; i < count; ++i)
    {
      for (int s = 0; s < span; ++s)
        offset[i] += mult[i][s] * dir[s][k];
      lo = std::max(lo, -kGridMax - offset[i]);
      hi = std::min(hi, kGridMax - offset[i]);
    }
    if (lo > hi)
      return false;
    const std::int64_t base = rng.Int(lo, hi);
    for (int i = 0; i < count; ++i)
      out[i][k] = base + offset[i];
  }
  return true;
}

// |g·h| = |g·conj(h)|, so the sign changes and swaps of both products' coordinates give up to 16
// lattice points on one circle.
bool CocircularGridPoints(Rng &rng, GridPoints &out)
{
  const std::int64_t g1 = rng.Int(-2048, 2048), g2 = rng.Int(-2048, 2048);
  const std::int64_t h1 = rng.Int(-1024, 1024), h2 = rng.Int(-1024, 1024);
  const std::int64_t p[2][2] = {{g1 * h1 - g2 * h2, g1 * h2 + g2 * h1}, {g1 * h1 + g2 * h2, g2 * h1 - g1 * h2}};
  std::int64_t on[16][2];
  std::int64_t radius = 0;
  for (int j = 0; j < 16; ++j)
  {
    const std::int64_t *q = p[j >> 3];
    const std::int64_t x = q[(j >> 2) & 1], y = q[1 - ((j >> 2) & 1)];
    on[j][0] = (j & 1) ? -x : x;
    on[j][1] = (j & 2) ? -y : y;
    radius = std::max({radius, std::abs(x), std::abs(y)});
  }
  if (radius == 0 || radius > kGridMax)
    return false;
  const std::int64_t cx = rng.Int(radius - kGridMax, kGridMax - radius);
  const std::int64_t cy = rng.Int(radius - kGridMax, kGridMax - radius);
  out = {};
  for (int i = 0; i < 4; ++i)
  {
    const std::int64_t *q = on[rng.Int(0, 15)];
    for (int j = 0; j < i; ++j)
      if (out[j][0] == cx + q[0] && out[j][1] == cy + q[1])
        return false;
    out[i][0] = cx + q[0];
    out[i][1] = cy + q[1];
  }
  return true;
}

enum class GridGenerator
{
  Uniform,
  Extremes,
  Neighbours,
  Degenerate,
  Snapped
};
constexpr GridGenerator kGridGenerators[] = {GridGenerator::Uniform, GridGenerator::Extremes, GridGenerator::Neighbours,
                                             GridGenerator::Degenerate, GridGenerator::Snapped};

const char *Name(GridGenerator g)
{
  switch (g)
  {
  case GridGenerator::Uniform:
    return "uniform";
  case GridGenerator::Extremes:
    return "extremes";
  case GridGenerator::Neighbours:
    return "one step apart";
  case GridGenerator::Degenerate:
    return "degenerate";
  case GridGenerator::Snapped:
    return "snapped";
  }
  return "";
}

// The widest coordinates and differences are where a 24-bit grid coordinate has its most bits.
std::int64_t ExtremeGridCoordinate(Rng &rng)
{
  constexpr std::int64_t picks[] = {kGridMax, kGridMax - 1, -kGridMax, 1 - kGridMax, 0, 1, -1};
  const std::int64_t i = rng.Int(0, 7);
  return i < 7 ? picks[i] : rng.Int(-kGridMax, kGridMax);
}

// Fills k with grid units; `snapper` provides the snapping of random doubles for the Snapped kind.
void GenerateGrid(Rng &rng, Predicate p, GridGenerator g, const Arith &snapper, double unit, GridPoints &k)
{
  const int dim = Dimension(p), count = PointCount(p);
  k = {};
  switch (g)
  {
  case GridGenerator::Uniform:
  case GridGenerator::Extremes:
    for (int i = 0; i < count; ++i)
      for (int j = 0; j < dim; ++j)
        k[i][j] = g == GridGenerator::Uniform ? rng.Int(-kGridMax, kGridMax) : ExtremeGridCoordinate(rng);
    return;
  case GridGenerator::Neighbours:
    for (int j = 0; j < dim; ++j)
    {
      const std::int64_t base = rng.OneIn(2) ? ExtremeGridCoordinate(rng) : rng.Int(-kGridMax, kGridMax);
      for (int i = 0; i < count; ++i)
        k[i][j] = ClampToGrid(base + rng.Int(-1, 1));
    }
    return;
  case GridGenerator::Degenerate:
  {
    bool made = false;
    while (!made)
      made = p == Predicate::InCircle && !rng.OneIn(4)
                 ? CocircularGridPoints(rng, k)
                 : SpannedGridPoints(rng, dim, count, std::max(0, dim - 1 - (rng.OneIn(8) ? 1 : 0)), k);
    if (!rng.OneIn(3))
    {
      std::int64_t &v = k[rng.Int(0, count - 1)][rng.Int(0, dim - 1)];
      v = ClampToGrid(v + (rng.OneIn(2) ? 1 : -1) * rng.Int(1, 2));
    }
    return;
  }
  case GridGenerator::Snapped:
  {
    const double P = unit * 0x1p22;
    for (int i = 0; i < count; ++i)
    {
      RKMMathPoint point(rng.Symmetric() * P, rng.Symmetric() * P, rng.Symmetric() * P);
      snapper.Normalize(point);
      for (int j = 0; j < dim; ++j)
      {
        const double units = point[j] / unit;
        k[i][j] = static_cast<std::int64_t>(units);
        EXPECT_TRUE(static_cast<double>(k[i][j]) == units && std::abs(k[i][j]) <= kGridMax)
            << std::hexfloat << point[j] << " is no grid coordinate for the unit " << unit;
      }
    }
    return;
  }
  }
}

// A plain float evaluation of grid points: the expanded cofactor form in 2D, since the difference
// form rounds the two products of a collinear triple alike.
int PlainFloatSign(Predicate p, const Case &c)
{
  const Points<float> f = Convert<float>(c);
  if (p != Predicate::Orientation2D)
    return Reference(p, f);
  const float det = f[0][0] * f[1][1] - f[0][1] * f[1][0] + f[1][0] * f[2][1] - f[1][1] * f[2][0] + f[2][0] * f[0][1] -
                    f[2][1] * f[0][0];
  return Sign(det);
}

double PowerOfTwoAtLeast(double m)
{
  double p = 1.0;
  while (p < m)
    p *= 2.0;
  while (p / 2.0 >= m)
    p /= 2.0;
  return p;
}

// A maximum of 0 stands for the default construction, left without SetMaxCoord (M = 100000). On
// the grids around 1e-30, ε² falls near the last bit of a coordinate difference, where a split
// scaled for products of two differences goes wrong.
const std::vector<float> kGrids = {0.0f,     1.0f,      0.75f,     3e6f,      1e-3f, 0x1p100f,
                                   0x1p127f, 0x1p-126f, 0x1p-107f, 0x1p-104f, 1e-30f};

void CheckGridded(Predicate p, std::uint64_t seedBase)
{
  const int gridCount = static_cast<int>(kGrids.size());
  constexpr int kKinds = sizeof kGridGenerators / sizeof kGridGenerators[0];
  const long perBatch = Count(3'000'000) / (gridCount * kKinds) + 1;
  long total = 0;
  for (int gi = 0; gi < gridCount; ++gi)
  {
    Arith gridded, adaptive(Arith::Adaptive);
    const float M = kGrids[gi] > 0.0f ? kGrids[gi] : 100000.0f;
    if (kGrids[gi] > 0.0f)
    {
      ASSERT_EQ(gridded.SetMaxCoord(M), S_OK) << M;
    }
    const double unit = 2.0 * gridded.GetCoordinatePrecision();
    ASSERT_EQ(unit, PowerOfTwoAtLeast(M) * 0x1p-22) << "grid of M = " << M;
    for (int gen = 0; gen < kKinds; ++gen)
    {
      const GridGenerator g = kGridGenerators[gen];
      const std::uint64_t seed = seedBase + 16 * gi + gen;
      std::ostringstream domain;
      domain << "grid of M = " << M;
      Tally tally(p, Context(p, Name(g), domain.str(), seed));
      Rng rng(seed);
      long floatWrong = 0;
      for (long n = 0; n < perBatch; ++n)
      {
        GridPoints k;
        GenerateGrid(rng, p, g, gridded, unit, k);
        Case c{};
        for (int i = 0; i < 4; ++i)
          for (int j = 0; j < 3; ++j)
            c[i][j] = static_cast<double>(k[i][j]) * unit;
        const int expected = Reference(p, Convert<__int128>(k));
        // Both modes face the same reference, so they also agree with each other on the grid.
        tally.Check(expected, LibrarySign(gridded, p, c), c, "Gridded");
        tally.Check(expected, LibrarySign(adaptive, p, c), c, "Adaptive");
        floatWrong += PlainFloatSign(p, c) != expected;
      }
      // Where float neither overflows nor underflows, its failures show that the degenerate cases
      // reach beyond what a plain evaluation settles.
      if (g == GridGenerator::Degenerate && unit >= 0x1p-36 && unit <= 0x1p8)
      {
        EXPECT_GT(floatWrong * 100, perBatch) << "too few cases beyond a plain float evaluation, seed " << seed;
      }
      total += tally.Checks();
    }
  }
  testing::Test::RecordProperty("checks", std::to_string(total));
}

enum class Spread
{
  Unit,
  Wide,
  Far,
  Huge,
  Tiny,
  Mixed
};

const char *Name(Spread s)
{
  constexpr const char *names[] = {"unit", "wide", "far", "huge", "tiny", "mixed"};
  return names[static_cast<int>(s)];
}

double Coordinate(Rng &rng, Spread s)
{
  switch (s)
  {
  case Spread::Unit:
    return rng.Symmetric();
  case Spread::Wide:
    return rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(-40, 40);
  case Spread::Far:
    // Coordinates near ±1e15 beside small ones make the coordinate differences inexact.
    if (rng.OneIn(2))
      return rng.Sign() * 1e15 + rng.Symmetric() * rng.Pow2(-10, 20);
    return Coordinate(rng, rng.OneIn(2) ? Spread::Unit : Spread::Wide);
  case Spread::Huge:
    return rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(660, 700);
  case Spread::Tiny:
    if (rng.OneIn(3))
      return rng.Sign() * std::ldexp(static_cast<double>(rng.Int(1, (std::int64_t(1) << 52) - 1)), -1074);
    return rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(-700, -660);
  case Spread::Mixed:
  {
    constexpr Spread parts[] = {Spread::Unit, Spread::Far, Spread::Huge, Spread::Tiny};
    return Coordinate(rng, parts[rng.Int(0, 3)]);
  }
  }
  return 0.0;
}

enum class DoubleGenerator
{
  Uniform,
  Rounded,
  FineGrid
};
constexpr DoubleGenerator kDoubleGenerators[] = {DoubleGenerator::Uniform, DoubleGenerator::Rounded,
                                                 DoubleGenerator::FineGrid};

const char *Name(DoubleGenerator g)
{
  return g == DoubleGenerator::Uniform ? "uniform" : g == DoubleGenerator::Rounded ? "rounded degenerate" : "fine grid";
}

// Points made collinear, coplanar or cocircular in real arithmetic, then rounded to doubles and
// moved by up to three ulps, so the exact sign hangs on the last bits.
void RoundedDegenerate(Rng &rng, Predicate p, Spread s, Case &c)
{
  const int dim = Dimension(p), count = PointCount(p);
  if (p == Predicate::InCircle)
  {
    const double cx = Coordinate(rng, s), cy = Coordinate(rng, s);
    double r = 0.0;
    while (r == 0.0)
      r = std::fabs(Coordinate(rng, s));
    for (int i = 0; i < 4; ++i)
    {
      const double t = 6.283185307179586 * rng.Unit();
      c[i][0] = cx + r * std::cos(t);
      c[i][1] = cy + r * std::sin(t);
    }
  }
  else
  {
    for (int i = 0; i < count - 1; ++i)
      for (int k = 0; k < dim; ++k)
        c[i][k] = Coordinate(rng, s);
    const double u = 4.0 * rng.Unit() - 1.5, v = 4.0 * rng.Unit() - 1.5;
    for (int k = 0; k < dim; ++k)
      c[count - 1][k] = c[0][k] + u * (c[1][k] - c[0][k]) + (dim == 3 ? v * (c[2][k] - c[0][k]) : 0.0);
  }
  for (int k = 0; k < dim; ++k)
    c[count - 1][k] = Nudge(c[count - 1][k], static_cast<int>(rng.Int(-3, 3)));
  if (rng.OneIn(2))
  {
    double &v = c[rng.Int(0, count - 2)][rng.Int(0, dim - 1)];
    v = Nudge(v, static_cast<int>(rng.Int(-3, 3)));
  }
  // The constructed point takes every slot, so every operand of the kernels meets it.
  std::swap(c[count - 1], c[rng.Int(0, count - 1)]);
}

// Exactly degenerate lattice points, scaled by a power of two and translated by a common offset
// (both exact), then usually one coordinate moved by one ulp.
void FineGridDegenerate(Rng &rng, Predicate p, Spread s, Case &c)
{
  const int dim = Dimension(p), count = PointCount(p);
  GridPoints k;
  bool made = false;
  while (!made)
    made = p == Predicate::InCircle ? CocircularGridPoints(rng, k) : SpannedGridPoints(rng, dim, count, dim - 1, k);
  int lo = -40, hi = -10;
  std::int64_t shift = 0;
  switch (s)
  {
  case Spread::Unit:
    break;
  case Spread::Wide:
    lo = -100, hi = 100;
    break;
  case Spread::Far:
    lo = -20, hi = 10, shift = std::int64_t(1) << 36;
    break;
  case Spread::Huge:
    lo = 640, hi = 960;
    break;
  case Spread::Tiny:
    lo = -1074, hi = -640;
    break;
  case Spread::Mixed:
    lo = -1074, hi = 960, shift = (std::int64_t(1) << 52) - kGridMax;
    break;
  }
  const int e = static_cast<int>(rng.Int(lo, hi));
  std::int64_t offset[3];
  for (int j = 0; j < dim; ++j)
    offset[j] = rng.Int(-shift, shift);
  for (int i = 0; i < count; ++i)
    for (int j = 0; j < dim; ++j)
      c[i][j] = std::ldexp(static_cast<double>(k[i][j] + offset[j]), e);
  if (!rng.OneIn(4))
  {
    double &v = c[rng.Int(0, count - 1)][rng.Int(0, dim - 1)];
    v = Nudge(v, rng.OneIn(2) ? 1 : -1);
  }
}

bool Finite(const Case &c)
{
  for (const auto &point : c)
    for (const double v : point)
      if (!std::isfinite(v))
        return false;
  return true;
}

void GenerateDoubles(Rng &rng, Predicate p, DoubleGenerator g, Spread s, Case &c)
{
  do
  {
    c = {};
    switch (g)
    {
    case DoubleGenerator::Uniform:
      for (int i = 0; i < PointCount(p); ++i)
        for (int k = 0; k < Dimension(p); ++k)
          c[i][k] = Coordinate(rng, s);
      break;
    case DoubleGenerator::Rounded:
      RoundedDegenerate(rng, p, s, c);
      break;
    case DoubleGenerator::FineGrid:
      FineGridDegenerate(rng, p, s, c);
      break;
    }
  } while (!Finite(c));
}

// True when some coordinate difference the kernels form is not exact in double.
bool InexactDifferences(Predicate p, const Case &c)
{
  for (int i = 0; i < PointCount(p); ++i)
    for (int j = 0; j < i; ++j)
      for (int k = 0; k < Dimension(p); ++k)
      {
        const double d = c[i][k] - c[j][k];
        if (mpq_class(d) != mpq_class(c[i][k]) - mpq_class(c[j][k]))
          return true;
      }
  return false;
}

struct AdaptiveStats
{
  long checks = 0;
  long hard = 0;
  long deep = 0;
};

// Both adaptive modes against the exact sign, per generator and spread. `hard` counts the cases a
// plain double evaluation gets wrong; `deep` those of them whose coordinate differences are inexact
// too, which only the last stages of the kernels settle.
AdaptiveStats CheckAdaptive(Predicate p, DoubleGenerator g, Spread s, long cases, std::uint64_t seed)
{
  const Arith adaptive(Arith::Adaptive), adaptive2(Arith::Adaptive2);
  Tally tally(p, Context(p, Name(g), Name(s), seed));
  Rng rng(seed);
  AdaptiveStats stats;
  for (long n = 0; n < cases; ++n)
  {
    Case c;
    GenerateDoubles(rng, p, g, s, c);
    const int expected = ExactSign(p, c);
    tally.Check(expected, LibrarySign(adaptive, p, c), c, "Adaptive");
    tally.Check(expected, LibrarySign(adaptive2, p, c), c, "Adaptive2");
    if (Reference(p, c) != expected)
    {
      ++stats.hard;
      if (g != DoubleGenerator::Uniform && InexactDifferences(p, c))
        ++stats.deep;
    }
  }
  stats.checks = tally.Checks();
  return stats;
}

void CheckAdaptiveModerate(Predicate p, std::uint64_t seedBase)
{
  const Spread spreads[] = {Spread::Unit, Spread::Wide, Spread::Far};
  const long perBatch = Count(2'000'000) / 9 + 1;
  long total = 0;
  for (const DoubleGenerator g : kDoubleGenerators)
    for (const Spread s : spreads)
    {
      const std::uint64_t seed = seedBase + 16 * static_cast<int>(g) + static_cast<int>(s);
      const AdaptiveStats stats = CheckAdaptive(p, g, s, perBatch, seed);
      total += stats.checks;
      // Far lattice points keep their differences exact and their 2D products barely round, so a
      // plain 2D evaluation rarely fails there; elsewhere the degenerate kinds must be hard.
      if (g != DoubleGenerator::Uniform &&
          !(g == DoubleGenerator::FineGrid && s == Spread::Far && p == Predicate::Orientation2D))
      {
        EXPECT_GT(stats.hard * 100, perBatch)
            << "too few hard cases: " << Name(g) << ", " << Name(s) << ", seed " << seed;
      }
      if (g == DoubleGenerator::Rounded && s == Spread::Far)
      {
        EXPECT_GT(stats.deep * 100, perBatch) << "too few cases for the last stages, seed " << seed;
      }
    }
  testing::Test::RecordProperty("checks", std::to_string(total));
}

Case Permuted(const Case &c, const int *order)
{
  Case out = c;
  for (int i = 0; i < 4; ++i)
    out[i] = c[order[i]];
  return out;
}

int Parity(const int *order, int n)
{
  int inversions = 0;
  for (int i = 0; i < n; ++i)
    for (int j = i + 1; j < n; ++j)
      inversions += order[i] > order[j];
  return inversions % 2 ? -1 : 1;
}

} // namespace

TEST(RKMPolyExactOrientation, GriddedOrientation2DExactOnGrid) { CheckGridded(Predicate::Orientation2D, 0x2D00); }
TEST(RKMPolyExactOrientation, GriddedOrientation3DExactOnGrid) { CheckGridded(Predicate::Orientation3D, 0x3D00); }
TEST(RKMPolyExactOrientation, InCircleExactOnGrid) { CheckGridded(Predicate::InCircle, 0x1C00); }

TEST(RKMPolyExactOrientation, AdaptiveOrientation2DExact) { CheckAdaptiveModerate(Predicate::Orientation2D, 0xA2D00); }
TEST(RKMPolyExactOrientation, AdaptiveOrientation3DExact) { CheckAdaptiveModerate(Predicate::Orientation3D, 0xA3D00); }
TEST(RKMPolyExactOrientation, AdaptiveInCircleExact) { CheckAdaptiveModerate(Predicate::InCircle, 0xA1C00); }

TEST(RKMPolyExactOrientation, AdaptiveExactAtExtremeMagnitudes)
{
  // Products of differences overflow or underflow here, so the answers come from the integer
  // fallback or from shortcuts that must know when not to trust themselves.
  const Spread spreads[] = {Spread::Huge, Spread::Tiny, Spread::Mixed};
  const long perBatch = Count(300'000) / 9 + 1;
  for (const Predicate p : kPredicates)
    for (const DoubleGenerator g : kDoubleGenerators)
      for (const Spread s : spreads)
        CheckAdaptive(p, g, s, perBatch,
                      0xE000 + 256 * static_cast<int>(p) + 16 * static_cast<int>(g) + static_cast<int>(s));
}

TEST(RKMPolyExactOrientation, PermutationsChangeSignByParity)
{
  const long perBatch = Count(20'000);
  for (const Predicate p : kPredicates)
  {
    // The orientations are alternating in all their points; InCircle, normalised by the turn of
    // a, b, c, must not care about their order, clockwise or not, unless they are collinear.
    const int permuted = p == Predicate::InCircle ? 3 : PointCount(p);
    for (const Mode mode : {Arith::Gridded, Arith::Adaptive, Arith::Adaptive2})
    {
      const Arith arith(mode);
      const std::uint64_t seed = 0x9E00 + 16 * static_cast<int>(p) + mode;
      Tally tally(p, Context(p, "permutations", ModeName(mode), seed));
      Rng rng(seed);
      for (long n = 0; n < perBatch; ++n)
      {
        Case c{};
        if (mode == Arith::Gridded)
        {
          GridPoints k;
          GenerateGrid(rng, p, GridGenerator::Degenerate, arith, 2.0 * arith.GetCoordinatePrecision(), k);
          for (int i = 0; i < 4; ++i)
            for (int j = 0; j < 3; ++j)
              c[i][j] = static_cast<double>(k[i][j]) * 2.0 * arith.GetCoordinatePrecision();
        }
        else
        {
          GenerateDoubles(rng, p, DoubleGenerator::Rounded, rng.OneIn(2) ? Spread::Unit : Spread::Far, c);
        }
        const int base = LibrarySign(arith, p, c);
        // Collinear a, b, c leave InCircle the raw lifted determinant, alternating like the others.
        const bool alternating = p != Predicate::InCircle || ExactSign(Predicate::Orientation2D, c) == 0;
        int order[4] = {0, 1, 2, 3};
        while (std::next_permutation(order, order + permuted))
        {
          const int expected = alternating ? base * Parity(order, permuted) : base;
          const Case q = Permuted(c, order);
          tally.Check(expected, LibrarySign(arith, p, q), q, ModeName(mode));
        }
      }
    }
  }
}

TEST(RKMPolyExactOrientation, UnknownModeAnswersZeroButInCircleStaysExact)
{
  const long cases = Count(20'000);
  for (const std::int32_t stored : {3, -1, 12345})
  {
    const Arith arith(static_cast<Mode>(stored));
    const std::uint64_t seed = 0x3300 + static_cast<std::uint32_t>(stored);
    Rng rng(seed);
    for (const Predicate p : kPredicates)
    {
      Tally tally(p, Context(p, "mixed", "mode " + std::to_string(stored), seed));
      for (long n = 0; n < cases; ++n)
      {
        Case c;
        GenerateDoubles(rng, p, rng.OneIn(2) ? DoubleGenerator::Uniform : DoubleGenerator::Rounded,
                        rng.OneIn(2) ? Spread::Unit : Spread::Far, c);
        tally.Check(p == Predicate::InCircle ? ExactSign(p, c) : 0, LibrarySign(arith, p, c), c, "stored mode");
      }
    }
  }
}

TEST(RKMPolyExactOrientation, TextbookConfigurationsInEveryMode)
{
  for (const Mode mode : {Arith::Gridded, Arith::Adaptive, Arith::Adaptive2})
  {
    SCOPED_TRACE(ModeName(mode));
    const Arith arith(mode);
    const RKMMathPoint2D o(0, 0), x(1, 0), y(0, 1), xy(1, 1), mid(0.5, 0.5);
    EXPECT_EQ(arith.Orientation2D(o, x, y), 1);
    EXPECT_EQ(arith.Orientation2D(o, y, x), -1);
    EXPECT_EQ(arith.Orientation2D(o, mid, xy), 0);
    EXPECT_EQ(arith.Orientation2D(o, o, x), 0);

    const RKMMathPoint O(0, 0, 0), X(1, 0, 0), Y(0, 1, 0), Z(0, 0, 1);
    EXPECT_EQ(arith.Orientation3D(O, X, Y, Z), 1);
    EXPECT_EQ(arith.Orientation3D(O, X, Y, RKMMathPoint(0, 0, -1)), -1);
    EXPECT_EQ(arith.Orientation3D(O, X, Y, RKMMathPoint(0.5, 0.25, 0)), 0);
    EXPECT_EQ(arith.Orientation3D(O, Y, X, Z), -1);

    const RKMMathPoint2D e(1, 0), n(0, 1), w(-1, 0);
    for (const bool clockwise : {false, true})
    {
      SCOPED_TRACE(clockwise ? "clockwise" : "counter-clockwise");
      const RKMMathPoint2D &first = clockwise ? w : e, &last = clockwise ? e : w;
      EXPECT_EQ(arith.InCircle(first, n, last, o), 1);
      EXPECT_EQ(arith.InCircle(first, n, last, RKMMathPoint2D(2, 0)), -1);
      EXPECT_EQ(arith.InCircle(first, n, last, RKMMathPoint2D(0, -1)), 0);
    }
  }
}

namespace
{
constexpr double kSplitter = 0x1p27 + 1.0;
constexpr double kEpsilon = 0x1p-53;

// Dekker's split as the kernel writes it, and as a compiler contracts it once both subtractions
// take the product c = splitter·a into a fused multiply-add: big is then exactly 2^27·a, hi comes
// out as a itself, and the products of the halves stop being exact. (Fusing c − a alone would still
// leave a 26-bit hi.)
void SplitRounded(double a, double &hi, double &lo)
{
  const double c = kSplitter * a;
  const double big = c - a;
  hi = c - big;
  lo = a - hi;
}

void SplitFused(double a, double &hi, double &lo)
{
  const double big = std::fma(kSplitter, a, -a);
  hi = std::fma(kSplitter, a, -big);
  lo = a - hi;
}

using SplitFunction = void (*)(double, double &, double &);

void TwoProduct(SplitFunction split, double a, double b, double &x, double &y)
{
  x = a * b;
  double ahi, alo, bhi, blo;
  split(a, ahi, alo);
  split(b, bhi, blo);
  const double err1 = x - ahi * bhi;
  const double err2 = err1 - alo * bhi;
  const double err3 = err2 - ahi * blo;
  y = alo * blo - err3;
}

bool ExactTwoProduct(SplitFunction split, double a, double b)
{
  double x, y;
  TwoProduct(split, a, b, x, y);
  return mpq_class(x) + mpq_class(y) == mpq_class(a) * mpq_class(b);
}

// The sign ax·by − ay·bx takes when both products go through the two-product with this split: the
// sign a kernel built on it reports once its first filter gives up and the differences are exact.
int TwoProductDeterminantSign(SplitFunction split, double ax, double ay, double bx, double by)
{
  double x1, y1, x2, y2;
  TwoProduct(split, ax, by, x1, y1);
  TwoProduct(split, ay, bx, x2, y2);
  const mpq_class det = mpq_class(x1) + mpq_class(y1) - mpq_class(x2) - mpq_class(y2);
  return sgn(det);
}
} // namespace

// Fails if fused multiply-adds get into the kernel's split on hardware that has them: the inputs are
// chosen so that a fused split gives a wrong sign, and the library must still give the exact one.
// Built with -mfma -ffp-contract=fast, GCC 12's kernel fails the 2D half; its contracted 3D kernel
// happens to stay exact.
TEST(RKMPolyExactOrientation, ContractionCanary)
{
  const std::uint64_t seed = 0xCA7A;
  Rng rng(seed);
  // a = (ax, ay), b = (bx, by), c at the origin: exact differences, products that nearly cancel.
  std::vector<std::array<double, 4>> inputs;
  const std::size_t wanted = static_cast<std::size_t>(Count(5'000));
  for (long tries = 0; inputs.size() < wanted && tries < 1000 * static_cast<long>(wanted); ++tries)
  {
    const double ax = rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(-30, 30);
    const double ay = rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(-30, 30);
    const double by = rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(-30, 30);
    const double bx = Nudge(ax * by / ay, static_cast<int>(rng.Int(-2, 2)));
    // Only cases the kernel's first, plain filter leaves open reach the two-products.
    const double left = ax * by, right = ay * bx;
    if (!(std::fabs(left - right) < (3.0 + 16.0 * kEpsilon) * kEpsilon * (std::fabs(left) + std::fabs(right))))
      continue;
    const int exact = sgn(mpq_class(ax) * mpq_class(by) - mpq_class(ay) * mpq_class(bx));
    if (TwoProductDeterminantSign(SplitFused, ax, ay, bx, by) != exact)
      inputs.push_back({ax, ay, bx, by});
  }
  ASSERT_EQ(inputs.size(), wanted) << "seed " << seed;

  const double origin[3] = {0, 0, 0}, up[3] = {0, 0, 1};
  for (const Mode mode : kAdaptiveModes)
  {
    const Arith arith(mode);
    Tally tally2(Predicate::Orientation2D, Context(Predicate::Orientation2D, "canary", ModeName(mode), seed));
    Tally tally3(Predicate::Orientation3D, Context(Predicate::Orientation3D, "canary", ModeName(mode), seed));
    for (const auto &[ax, ay, bx, by] : inputs)
    {
      SCOPED_TRACE(testing::Message() << std::hexfloat << "a = (" << ax << ", " << ay << "), b = (" << bx << ", " << by
                                      << "), seed " << seed);
      // The fused split breaks a two-product here while the rounded one stays exact, so the
      // difference lies in the contraction alone.
      EXPECT_FALSE(ExactTwoProduct(SplitFused, ax, by) && ExactTwoProduct(SplitFused, ay, bx));
      EXPECT_TRUE(ExactTwoProduct(SplitRounded, ax, by) && ExactTwoProduct(SplitRounded, ay, bx));
      const int exact = sgn(mpq_class(ax) * mpq_class(by) - mpq_class(ay) * mpq_class(bx));
      EXPECT_EQ(TwoProductDeterminantSign(SplitRounded, ax, ay, bx, by), exact);

      const Case flat = {{{ax, ay, 0}, {bx, by, 0}, {0, 0, 0}, {0, 0, 0}}};
      tally2.Check(exact, arith.Orientation2D(flat[0].data(), flat[1].data(), origin), flat, ModeName(mode));
      // The same two products make the only non-zero minor of this tetrahedron.
      const Case solid = {{{ax, ay, 0}, {bx, by, 0}, {0, 0, 1}, {0, 0, 0}}};
      tally3.Check(ExactSign(Predicate::Orientation3D, solid),
                   arith.Orientation3D(solid[0].data(), solid[1].data(), up, origin), solid, ModeName(mode));
    }
  }
}
