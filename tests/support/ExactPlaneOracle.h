#pragma once

// Exact rational reference for the plane intersectors, and the point generators of the intersector
// sweeps. Every double converts to an mpq_class without rounding, so the answers below are the true
// ones for the doubles the intersectors see, whatever the arithmetic mode.

#include <gmpxx.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <ostream>
#include <random>
#include <sstream>
#include <string>
#include <type_traits>
#include <vector>

#include "RKMMathPoint.h"
#include "RKMMathPoint2D.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyIntersectionPoint.h"

// Sanitized builds run the same randomized checks on fewer cases.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
#define RKM_EXACT_ORACLE_SANITIZED 1
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
#define RKM_EXACT_ORACLE_SANITIZED 1
#endif
#endif
#ifndef RKM_EXACT_ORACLE_SANITIZED
#define RKM_EXACT_ORACLE_SANITIZED 0
#endif

namespace oracle
{
constexpr int kScale = RKM_EXACT_ORACLE_SANITIZED ? 20 : 1;

using Mode = RKMPolyExactArithmetic::Mode;

inline const char *ModeName(Mode m)
{
  return m == RKMPolyExactArithmetic::Gridded ? "Gridded" : "Adaptive";
}

struct QPoint
{
  mpq_class x, y;
};

inline QPoint Q(const RKMMathPoint2D &p)
{
  return {mpq_class(p.x), mpq_class(p.y)};
}

inline bool operator==(const QPoint &a, const QPoint &b)
{
  return a.x == b.x && a.y == b.y;
}

inline mpq_class Cross(const QPoint &a, const QPoint &b, const QPoint &c)
{
  return (b.x - a.x) * (c.y - a.y) - (b.y - a.y) * (c.x - a.x);
}

inline int Orient(const QPoint &a, const QPoint &b, const QPoint &c)
{
  return sgn(Cross(a, b, c));
}

// On the closed segment ab (a may equal b).
inline bool OnClosedSegment(const QPoint &a, const QPoint &b, const QPoint &x)
{
  return Orient(a, b, x) == 0 && std::min(a.x, b.x) <= x.x && x.x <= std::max(a.x, b.x) &&
         std::min(a.y, b.y) <= x.y && x.y <= std::max(a.y, b.y);
}

inline QPoint Lerp(const QPoint &a, const QPoint &b, const mpq_class &t)
{
  return {a.x + t * (b.x - a.x), a.y + t * (b.y - a.y)};
}

inline std::string Str(const QPoint &p)
{
  return "(" + p.x.get_str() + "," + p.y.get_str() + ")";
}

inline std::string Str(const RKMMathPoint2D &p)
{
  std::ostringstream s;
  s.precision(17);
  s << "(" << p.x << "," << p.y << ")";
  return s.str();
}

inline std::string Str(const RKMMathPoint &p)
{
  std::ostringstream s;
  s.precision(17);
  s << "(" << p.x << "," << p.y << "," << p.z << ")";
  return s.str();
}

// A feature of one primitive as the intersection points describe it: type 1 vertex, 2 bar,
// 3 triangle interior, 0 none.
struct Feature
{
  int type = 0;
  int index = 0;
  bool operator==(const Feature &o) const { return type == o.type && index == o.index; }
  bool operator!=(const Feature &o) const { return !(*this == o); }
  bool operator<(const Feature &o) const { return type < o.type || (type == o.type && index < o.index); }
};

inline Feature Slot(const RKMPolyIntersectionPoint &pt, int slot)
{
  return {pt.entityType[slot], pt.index[slot]};
}

inline std::string Str(const Feature &f)
{
  static const char *const names[] = {"?", "V", "B", "T"};
  return (f.type >= 0 && f.type <= 3 ? names[f.type] : "!") + std::to_string(f.index);
}

// The lowest-dimensional feature of triangle t holding x; type 0 when x is outside the closed
// triangle.
inline Feature TriangleFeature(const QPoint t[3], const QPoint &x)
{
  for (int v = 0; v < 3; ++v)
    if (t[v] == x)
      return {1, v};
  for (int e = 0; e < 3; ++e)
    if (OnClosedSegment(t[e], t[(e + 1) % 3], x))
      return {2, e};
  const int o = Orient(t[0], t[1], t[2]);
  for (int e = 0; e < 3; ++e)
    if (Orient(t[e], t[(e + 1) % 3], x) != o)
      return {0, 0};
  return {3, 0};
}

// Segment p → q: vertex 0 is p, vertex 1 is q, bar 0 its open interior.
inline Feature SegmentFeature(const QPoint &p, const QPoint &q, const QPoint &x)
{
  if (x == p)
    return {1, 0};
  if (x == q)
    return {1, 1};
  return OnClosedSegment(p, q, x) ? Feature{2, 0} : Feature{0, 0};
}

// The vertex orders of a triangle: query vertex k is base vertex kPerm[π][k]. The first three keep
// the orientation, the last three reverse it.
constexpr int kPerm[6][3] = {{0, 1, 2}, {1, 2, 0}, {2, 0, 1}, {0, 2, 1}, {2, 1, 0}, {1, 0, 2}};
inline int PermSign(int p)
{
  return p < 3 ? 1 : -1;
}

// A base-numbering feature of a triangle expressed in the numbering of permutation p.
inline Feature Renumber(const Feature &f, int p)
{
  const int *m = kPerm[p];
  for (int k = 0; k < 3; ++k)
    if ((f.type == 1 && m[k] == f.index) ||
        (f.type == 2 && ((m[k] == f.index && m[(k + 1) % 3] == (f.index + 1) % 3) ||
                         (m[(k + 1) % 3] == f.index && m[k] == (f.index + 1) % 3))))
      return {f.type, k};
  return f;
}

// Strict convex hull, counter-clockwise, duplicates and points inside edges removed: one point for
// a point set, two for a segment.
inline std::vector<QPoint> ConvexHull(std::vector<QPoint> pts)
{
  std::sort(pts.begin(), pts.end(),
            [](const QPoint &a, const QPoint &b) { return a.x < b.x || (a.x == b.x && a.y < b.y); });
  pts.erase(std::unique(pts.begin(), pts.end()), pts.end());
  if (pts.size() <= 2)
    return pts;
  std::vector<QPoint> h;
  for (int pass = 0; pass < 2; ++pass)
  {
    const size_t base = h.size();
    for (const QPoint &p : pts)
    {
      while (h.size() >= base + 2 && Orient(h[h.size() - 2], h.back(), p) <= 0)
        h.pop_back();
      h.push_back(p);
    }
    h.pop_back();
    std::reverse(pts.begin(), pts.end());
  }
  return h;
}

// Sutherland–Hodgman step keeping the closed left side of the directed line ab.
inline std::vector<QPoint> ClipLeft(const std::vector<QPoint> &poly, const QPoint &a, const QPoint &b)
{
  std::vector<QPoint> out;
  for (size_t i = 0; i < poly.size(); ++i)
  {
    const QPoint &cur = poly[i], &nxt = poly[(i + 1) % poly.size()];
    const mpq_class sc = Cross(a, b, cur), sn = Cross(a, b, nxt);
    if (sgn(sc) >= 0)
      out.push_back(cur);
    if (sgn(sc) * sgn(sn) < 0)
      out.push_back(Lerp(cur, nxt, sc / (sc - sn)));
  }
  return out;
}

// The intersection of two closed triangles: result 3/2/1/0 as the triangle intersector counts it, or
// -6 for a degenerate triangle, with the corners counter-clockwise (the two ends for a segment), the
// features of each corner on the two triangles and the triangles' orientations.
struct PolygonAnswer
{
  int result = 0;
  std::vector<QPoint> corners;
  int orient[2] = {0, 0};
  std::vector<std::array<Feature, 2>> features;
};

inline PolygonAnswer IntersectTriangles(const QPoint t1[3], const QPoint t2[3])
{
  PolygonAnswer ans;
  const int o1 = Orient(t1[0], t1[1], t1[2]), o2 = Orient(t2[0], t2[1], t2[2]);
  if (o1 == 0 || o2 == 0)
  {
    ans.result = -6;
    return ans;
  }
  std::vector<QPoint> poly{t1[0], t1[1], t1[2]};
  if (o1 < 0)
    std::swap(poly[1], poly[2]);
  for (int e = 0; e < 3 && !poly.empty(); ++e)
    poly = o2 > 0 ? ClipLeft(poly, t2[e], t2[(e + 1) % 3]) : ClipLeft(poly, t2[(e + 1) % 3], t2[e]);
  ans.corners = ConvexHull(poly);
  ans.result = std::min<int>(3, static_cast<int>(ans.corners.size()));
  ans.orient[0] = o1;
  ans.orient[1] = o2;
  for (const QPoint &c : ans.corners)
    ans.features.push_back({TriangleFeature(t1, c), TriangleFeature(t2, c)});
  return ans;
}

// The overlap of segment p → q with a closed triangle, as parameters along the segment in
// increasing order; -5 for p == q, -6 for a degenerate triangle.
struct ClipAnswer
{
  int result = 0;
  std::vector<mpq_class> t;
};

inline ClipAnswer ClipSegment(const QPoint tri[3], const QPoint &p, const QPoint &q)
{
  ClipAnswer ans;
  const int o = Orient(tri[0], tri[1], tri[2]);
  if (p == q || o == 0)
  {
    ans.result = p == q ? -5 : -6;
    return ans;
  }
  mpq_class lo = 0, hi = 1;
  for (int e = 0; e < 3; ++e)
  {
    // f(t) = o · Cross(edge, p + t(q − p)) ≥ 0 on the triangle's side, affine in t.
    const mpq_class f0 = o * Cross(tri[e], tri[(e + 1) % 3], p), f1 = o * Cross(tri[e], tri[(e + 1) % 3], q);
    if (f0 == f1 && sgn(f0) < 0)
      return ans;
    if (f1 > f0)
      lo = std::max(lo, mpq_class(f0 / (f0 - f1)));
    else if (f1 < f0)
      hi = std::min(hi, mpq_class(f0 / (f0 - f1)));
  }
  if (lo > hi)
    return ans;
  ans.t.push_back(lo);
  if (lo < hi)
    ans.t.push_back(hi);
  ans.result = static_cast<int>(ans.t.size());
  return ans;
}

// Segments ab and cd as the segment intersector answers: -5, 0, 1 (with the point and its features)
// or 2, and whether the four points lie on one line.
struct CrossAnswer
{
  int result = 0;
  bool colinear = false;
  QPoint x;
  Feature f[2];
};

inline CrossAnswer IntersectSegments(const QPoint &a, const QPoint &b, const QPoint &c, const QPoint &d)
{
  CrossAnswer ans;
  if (a == b || c == d)
  {
    ans.result = -5;
    return ans;
  }
  const int o1 = Orient(c, d, a), o2 = Orient(c, d, b), o3 = Orient(a, b, c), o4 = Orient(a, b, d);
  if (o3 == 0 && o4 == 0)
  {
    // Positions along ab; the overlap of the two intervals decides.
    ans.colinear = true;
    auto s = [&](const QPoint &x) { return mpq_class((x.x - a.x) * (b.x - a.x) + (x.y - a.y) * (b.y - a.y)); };
    const mpq_class a1 = s(b), c0 = std::min(s(c), s(d)), c1 = std::max(s(c), s(d));
    const mpq_class lo = std::max(mpq_class(0), c0), hi = std::min(a1, c1);
    ans.result = lo < hi ? 2 : lo == hi ? 1 : 0;
    ans.x = sgn(lo) == 0 ? a : b;
  }
  else if (o1 * o2 > 0 || o3 * o4 > 0)
    ans.result = 0;
  else
  {
    ans.result = 1;
    const mpq_class ca = Cross(c, d, a), cb = Cross(c, d, b);
    ans.x = o1 == 0 ? a : o2 == 0 ? b : o3 == 0 ? c : o4 == 0 ? d : Lerp(a, b, ca / (ca - cb));
  }
  if (ans.result == 1)
  {
    ans.f[0] = SegmentFeature(a, b, ans.x);
    ans.f[1] = SegmentFeature(c, d, ans.x);
  }
  return ans;
}

// Which of a, b, c, d (1 to 4) lies closest to the other segment's line, ties to the earlier, from
// exact squared distances.
inline int ClosestExtremity(const QPoint &a, const QPoint &b, const QPoint &c, const QPoint &d)
{
  const QPoint q[4] = {a, b, c, d};
  int best = 0;
  mpq_class bestD;
  for (int k = 0; k < 4; ++k)
  {
    const QPoint &l0 = q[k < 2 ? 2 : 0], &l1 = q[k < 2 ? 3 : 1];
    const mpq_class cross = Cross(l0, l1, q[k]);
    const mpq_class dist = cross * cross / ((l1.x - l0.x) * (l1.x - l0.x) + (l1.y - l0.y) * (l1.y - l0.y));
    if (k == 0 || dist < bestD)
    {
      best = k;
      bestD = dist;
    }
  }
  return best + 1;
}

// Point generators. All points of one case come from one small integer grid pushed through one
// affine map, so that shared vertices, collinear edges and vertices on edges stay frequent.
enum class Layout
{
  // Integers 0 … k: exact in every mode.
  SmallGrid,
  // Integer matrix, offset a multiple of 1/32: still on the default grid, and collinearity is kept.
  Lattice,
  // Arbitrary doubles: every product rounds, so the inputs are nearly, not exactly, degenerate.
  // Only the Adaptive mode is exact on them.
  Skewed,
  // The small grid scaled by a power of two near the ends of the double range, where products of
  // coordinates underflow or overflow; exact data for the Adaptive mode.
  Extreme
};

// Points of dimension D from the small grid 0 … k through the case's affine map. The lattice and
// extreme maps differ by dimension: entries up to 40 in the plane and 20 in space, and powers of
// two chosen so that products of coordinates underflow or overflow.
template <int D> class GridPointSource
{
public:
  using Point = std::conditional_t<D == 2, RKMMathPoint2D, RKMMathPoint>;

  GridPointSource(std::uint64_t seed, Layout layout, int k) : m_rng(seed), m_layout(layout), m_k(k)
  {
    for (int i = 0; i < D; ++i)
      m_m[i * (D + 1)] = 1.0;
  }

  // A fresh map for the next case.
  void NewCase()
  {
    if (m_layout == Layout::Lattice)
    {
      // An integer matrix keeps collinearity and coplanarity; the offset is a multiple of the
      // default grid step, so Gridded data stay on the grid.
      std::uniform_int_distribution<int> m(D == 2 ? -40 : -20, D == 2 ? 40 : 20), o(-32000, 32000);
      do
      {
        for (double &v : m_m)
          v = m(m_rng);
      } while (Det() == 0);
      for (double &v : m_o)
        v = o(m_rng) / 32.0;
    }
    else if (m_layout == Layout::Skewed)
    {
      std::uniform_real_distribution<double> m(-3.0, 3.0), o(-1000.0, 1000.0);
      for (double &v : m_m)
        v = m(m_rng);
      for (double &v : m_o)
        v = o(m_rng);
    }
    else if (m_layout == Layout::Extreme)
    {
      static const int kPlane[] = {-1060, -700, -540, 520, 700, 1000};
      static const int kSpace[] = {-1060, -700, -540, -340, 340, 520, 700, 1000};
      const double s = D == 2 ? std::ldexp(1.0, kPlane[m_rng() % 6]) : std::ldexp(1.0, kSpace[m_rng() % 8]);
      for (int i = 0; i < D * D; ++i)
        m_m[i] = i % (D + 1) == 0 ? s : 0.0;
      for (double &v : m_o)
        v = 0.0;
    }
  }

  Point Next()
  {
    std::uniform_int_distribution<int> g(0, m_k);
    double u[D], x[D];
    for (double &v : u)
      v = g(m_rng);
    for (int r = 0; r < D; ++r)
    {
      x[r] = u[r];
      if (m_layout != Layout::SmallGrid)
      {
        x[r] = m_o[r] + m_m[r * D] * u[0] + m_m[r * D + 1] * u[1];
        if (D == 3)
          x[r] += m_m[r * D + 2] * u[2];
      }
    }
    if constexpr (D == 2)
      return {x[0], x[1]};
    else
      return {x[0], x[1], x[2]};
  }

  std::mt19937_64 &Rng() { return m_rng; }

private:
  double Det() const
  {
    if (D == 2)
      return m_m[0] * m_m[3] - m_m[1] * m_m[2];
    return m_m[0] * (m_m[4] * m_m[8] - m_m[5] * m_m[7]) - m_m[1] * (m_m[3] * m_m[8] - m_m[5] * m_m[6]) +
           m_m[2] * (m_m[3] * m_m[7] - m_m[4] * m_m[6]);
  }

  std::mt19937_64 m_rng;
  Layout m_layout;
  int m_k;
  double m_m[D * D] = {};
  double m_o[D] = {};
};

using PointSource = GridPointSource<2>;

// One randomized sweep: the mode, where the points come from, the grid size, how many cases and
// the seed that reproduces them; printed readably and deterministically in names and messages.
struct SweepCase
{
  Mode mode;
  Layout layout;
  int k;
  long count;
  std::uint64_t seed;
};

inline std::string SweepName(const SweepCase &c)
{
  static const char *const layouts[] = {"SmallGrid", "Lattice", "Skewed", "Extreme"};
  return std::string(ModeName(c.mode)) + "_" + layouts[static_cast<int>(c.layout)] + std::to_string(c.k);
}

inline void PrintTo(const SweepCase &c, std::ostream *os)
{
  *os << SweepName(c) << " x" << c.count << " seed " << c.seed;
}

} // namespace oracle
