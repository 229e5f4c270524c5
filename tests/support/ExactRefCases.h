#pragma once

// Random and degenerate cases for the exact predicates, each stream fixed by its seed: lattice
// points in grid units (2ε) that are exactly collinear, coplanar or cocircular, and doubles made
// degenerate then rounded, over spreads from unit to extreme magnitudes. Tally reports mismatches
// with their inputs in hex floats.

#include "ExactRefOracle.h"

#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <limits>
#include <random>
#include <utility>

namespace exactref
{
// Sanitized builds run the same generators on a tenth of the cases, other unoptimised ones on a
// fifth; RKM_EXACT_TEST_SCALE multiplies the counts for a longer hunt.
inline long Count(long normal)
{
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  double scale = 0.1;
#elif !defined(NDEBUG)
  double scale = 0.2;
#else
  double scale = 1.0;
#endif
  if (const char *env = std::getenv("RKM_EXACT_TEST_SCALE"); env && std::atof(env) > 0.0)
    scale *= std::atof(env);
  return std::max(1L, std::lround(static_cast<double>(normal) * scale));
}

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

inline double Nudge(double v, int ulps)
{
  const double inf = std::numeric_limits<double>::infinity();
  for (; ulps != 0; ulps += ulps > 0 ? -1 : 1)
    v = std::nextafter(v, ulps > 0 ? inf : -inf);
  return v;
}

// Grid coordinates are handled in grid units of 2ε.
constexpr std::int64_t kGridMax = std::int64_t(1) << 22;
inline std::int64_t ClampToGrid(std::int64_t k) { return std::clamp(k, -kGridMax, kGridMax); }

// base + Σ m·v over `span` random directions with small integer multipliers: exactly collinear
// (span 1), coplanar (span 2) or coincident (span 0). The base is drawn where every point stays in
// range, so large coordinates come with long and short directions alike.
inline bool SpannedGridPoints(Rng &rng, int dim, int count, int span, GridPoints &out)
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
// lattice points on one circle; four distinct ones are drawn.
inline bool CocircularGridPoints(Rng &rng, GridPoints &out)
{
  const std::int64_t g1 = rng.Int(-2048, 2048), g2 = rng.Int(-2048, 2048);
  const std::int64_t h1 = rng.Int(-1024, 1024), h2 = rng.Int(-1024, 1024);
  const std::int64_t p[2][2] = {{g1 * h1 - g2 * h2, g1 * h2 + g2 * h1}, {g1 * h1 + g2 * h2, g2 * h1 - g1 * h2}};
  std::int64_t on[16][2], radius = 0;
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

// Grid cases: uniform, at the extremes (where a 24-bit coordinate has its most bits), one step
// apart, degenerate (then often moved by a unit or two), or random doubles snapped by the library.
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
inline const char *Name(GridGenerator g)
{
  return std::array{"uniform", "extremes", "one step apart", "degenerate", "snapped"}[static_cast<int>(g)];
}

inline std::int64_t ExtremeGridCoordinate(Rng &rng)
{
  constexpr std::int64_t picks[] = {kGridMax, kGridMax - 1, -kGridMax, 1 - kGridMax, 0, 1, -1};
  const std::int64_t i = rng.Int(0, 7);
  return i < 7 ? picks[i] : rng.Int(-kGridMax, kGridMax);
}

// Fills k with grid units and returns the points in coordinates, k·unit; `snapper` snaps the
// random doubles of the Snapped kind.
inline Case GenerateGrid(Rng &rng, Predicate p, GridGenerator g, const RKMPolyExactArithmetic &snapper, double unit,
                         GridPoints &k)
{
  const int dim = Dimension(p), count = PointCount(p);
  k = {};
  if (g == GridGenerator::Uniform || g == GridGenerator::Extremes)
  {
    for (int i = 0; i < count; ++i)
      for (int j = 0; j < dim; ++j)
        k[i][j] = g == GridGenerator::Uniform ? rng.Int(-kGridMax, kGridMax) : ExtremeGridCoordinate(rng);
  }
  else if (g == GridGenerator::Neighbours)
  {
    for (int j = 0; j < dim; ++j)
    {
      const std::int64_t base = rng.OneIn(2) ? ExtremeGridCoordinate(rng) : rng.Int(-kGridMax, kGridMax);
      for (int i = 0; i < count; ++i)
        k[i][j] = ClampToGrid(base + rng.Int(-1, 1));
    }
  }
  else if (g == GridGenerator::Degenerate)
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
  }
  else
  {
    const double P = unit * 0x1p22;
    for (int i = 0; i < count; ++i)
    {
      RKMMathPoint point(rng.Symmetric() * P, rng.Symmetric() * P, rng.Symmetric() * P);
      snapper.Normalize(point);
      for (int j = 0; j < dim; ++j)
        k[i][j] = static_cast<std::int64_t>(point[j] / unit);
    }
  }
  Case c = Convert<double>(k);
  for (auto &point : c)
    for (double &v : point)
      v *= unit;
  return c;
}

// Where double coordinates come from: [-1, 1], 2^±40, near ±1e15 beside small ones (inexact
// differences), 2^660..2^700 (products overflow), subnormal to 2^-660 (products underflow), or all.
enum class Spread
{
  Unit,
  Wide,
  Far,
  Huge,
  Tiny,
  Mixed
};
inline const char *Name(Spread s)
{
  return std::array{"unit", "wide", "far", "huge", "tiny", "mixed"}[static_cast<int>(s)];
}

inline double Coordinate(Rng &rng, Spread s)
{
  switch (s)
  {
  case Spread::Unit:
    return rng.Symmetric();
  case Spread::Wide:
    return rng.Sign() * (1.0 + rng.Unit()) * rng.Pow2(-40, 40);
  case Spread::Far:
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

// Double cases: uniform; made collinear, coplanar or cocircular in real arithmetic then rounded and
// moved by up to three ulps; or exactly degenerate lattice points scaled and shifted exactly, then
// usually moved by one ulp.
enum class DoubleGenerator
{
  Uniform,
  Rounded,
  FineGrid
};
constexpr DoubleGenerator kDoubleGenerators[] = {DoubleGenerator::Uniform, DoubleGenerator::Rounded,
                                                 DoubleGenerator::FineGrid};
inline const char *Name(DoubleGenerator g)
{
  return std::array{"uniform", "rounded degenerate", "fine grid"}[static_cast<int>(g)];
}

inline void RoundedDegenerate(Rng &rng, Predicate p, Spread s, Case &c)
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

inline void FineGridDegenerate(Rng &rng, Predicate p, Spread s, Case &c)
{
  const int dim = Dimension(p), count = PointCount(p);
  GridPoints k;
  bool made = false;
  while (!made)
    made = p == Predicate::InCircle ? CocircularGridPoints(rng, k) : SpannedGridPoints(rng, dim, count, dim - 1, k);
  // Per spread: the range of the power-of-two scale and of the common offset.
  static const struct
  {
    int lo, hi;
    std::int64_t shift;
  } scales[] = {{-40, -10, 0}, {-100, 100, 0},   {-20, 10, std::int64_t(1) << 36},
                {640, 960, 0}, {-1074, -640, 0}, {-1074, 960, (std::int64_t(1) << 52) - kGridMax}};
  const auto &sc = scales[static_cast<int>(s)];
  const int e = static_cast<int>(rng.Int(sc.lo, sc.hi));
  std::int64_t offset[3];
  for (int j = 0; j < dim; ++j)
    offset[j] = rng.Int(-sc.shift, sc.shift);
  for (int i = 0; i < count; ++i)
    for (int j = 0; j < dim; ++j)
      c[i][j] = std::ldexp(static_cast<double>(k[i][j] + offset[j]), e);
  if (!rng.OneIn(4))
  {
    double &v = c[rng.Int(0, count - 1)][rng.Int(0, dim - 1)];
    v = Nudge(v, rng.OneIn(2) ? 1 : -1);
  }
}

// A finite case of the given kind (cases that overflowed are drawn again).
inline void GenerateDoubles(Rng &rng, Predicate p, DoubleGenerator g, Spread s, Case &c)
{
  for (bool finite = false; !finite;)
  {
    c = {};
    if (g == DoubleGenerator::Uniform)
      for (int i = 0; i < PointCount(p); ++i)
        for (int k = 0; k < Dimension(p); ++k)
          c[i][k] = Coordinate(rng, s);
    else if (g == DoubleGenerator::Rounded)
      RoundedDegenerate(rng, p, s, c);
    else
      FineGridDegenerate(rng, p, s, c);
    finite = true;
    for (const auto &point : c)
      for (const double v : point)
        finite = finite && std::isfinite(v);
  }
}

// Reports a disagreement with its inputs, the first five times.
struct Tally
{
  std::string context;
  int mismatches = 0;
  void Check(Predicate p, int expected, int got, const Case &c, const char *what)
  {
    if (expected != got && ++mismatches <= 5)
      ADD_FAILURE() << context << ", " << what << ": expected " << expected << ", got " << got << " for "
                    << Format(p, c);
  }
};
} // namespace exactref
