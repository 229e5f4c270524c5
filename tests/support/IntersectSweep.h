#pragma once

// What the intersector suites share beyond the exact references: the randomized sweep driver, which
// reports each failing case with its seed, the two arithmetic modes, the vertex orders and segment
// forms a base case is queried in, intersection points compared as feature pairs, and copies.

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <initializer_list>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "ExactPlaneOracle.h"

namespace oracle
{
constexpr Mode kGridded = RKMPolyExactArithmetic::Gridded, kAdaptive = RKMPolyExactArithmetic::Adaptive;
constexpr Mode kModes[] = {kGridded, kAdaptive};
constexpr Layout kSmallGrid = Layout::SmallGrid, kLattice = Layout::Lattice, kSkewed = Layout::Skewed;
constexpr Layout kExtreme = Layout::Extreme;

// One parameterised test per sweep case, named after its mode, layout and grid.
class SweepTest : public testing::TestWithParam<SweepCase>
{
};
inline std::string SweepTestName(const testing::TestParamInfo<SweepCase> &i)
{
  return SweepName(i.param);
}
#define RKM_SWEEPS(Suite, ...)                                                                                         \
  INSTANTIATE_TEST_SUITE_P(Random, Suite, testing::Values(__VA_ARGS__), oracle::SweepTestName)

// Runs the sweep's count / scale cases: check(src) draws one case from src and returns why it fails,
// or nothing. The first five failures are reported with the seed and the case number.
template <int D, class F> void Sweep(const SweepCase &c, int scale, F &&check)
{
  GridPointSource<D> src(c.seed, c.layout, c.k);
  long failed = 0;
  for (long i = 0; i < c.count / scale; ++i)
  {
    src.NewCase();
    const std::string why = check(src);
    if (!why.empty() && failed++ < 5)
      ADD_FAILURE() << "seed " << c.seed << " case " << i << ": " << why;
  }
  EXPECT_EQ(failed, 0) << "failing cases with seed " << c.seed;
}

// The kinds of answer a sweep met, so that it can check that it met every kind it should.
struct Seen
{
  std::map<std::string, long> n;
  void operator()(const std::string &kind) { ++n[kind]; }
  bool Met(const std::string &kind) const { return n.count(kind) > 0; }
  void Expect(std::initializer_list<std::string> kinds) const
  {
    for (const std::string &k : kinds)
      EXPECT_TRUE(Met(k)) << "the sweep never met " << k;
  }
};

template <class P> std::string Str3(const P *t)
{
  return Str(t[0]) + Str(t[1]) + Str(t[2]);
}

// Intersection points as feature pairs: "T0xB2" is the first primitive's interior against the
// second one's bar 2.
using Pair = std::array<Feature, 2>;
using Pairs = std::vector<Pair>;

inline std::string Str(const Pairs &ps)
{
  std::string s;
  for (const Pair &p : ps)
    s += (s.empty() ? "" : " ") + Str(p[0]) + "x" + Str(p[1]);
  return s;
}

// The points of the intersector's last answer; a pointer that disagrees with the count reads as one
// pair of type -1.
template <class T> Pairs Read(const T &inter)
{
  int n = -1;
  const RKMPolyIntersectionPoint *pts = inter.GetIntersectionPoints(n);
  if ((pts == nullptr) != (n == 0) || n < 0 || n > 6)
    return {{Feature{-1, n}, Feature{-1, n}}};
  Pairs out;
  for (int k = 0; k < n; ++k)
    out.push_back({Slot(pts[k], 0), Slot(pts[k], 1)});
  return out;
}

template <class T> std::string Unordered(const T &inter)
{
  Pairs p = Read(inter);
  std::sort(p.begin(), p.end());
  return Str(p);
}

// got against want: the same pairs in the same order, in any order, or (a polygon's corners) in
// cyclic order along direction.
enum class Order
{
  Exact,
  Any,
  Cyclic
};

inline std::string Match(Pairs got, Pairs want, Order order, int direction = 1)
{
  if (order == Order::Any)
  {
    std::sort(got.begin(), got.end());
    std::sort(want.begin(), want.end());
  }
  else if (order == Order::Cyclic && !got.empty())
  {
    if (direction < 0)
      std::reverse(want.begin(), want.end());
    const auto first = std::find(want.begin(), want.end(), got[0]);
    if (first != want.end())
      std::rotate(want.begin(), first, want.end());
  }
  return got == want ? std::string() : "got [" + Str(got) + "], expected [" + Str(want) + "]";
}

// One query made from a base pair of triangles: exchanged or not, the first in vertex order p1 and
// the second in p2 (kPerm). It renumbers the base answer's features and orientations.
struct View
{
  int swap, p1, p2;
  Pairs Of(const Pairs &base) const
  {
    Pairs w;
    for (const Pair &b : base)
      w.push_back({Renumber(b[swap], p1), Renumber(b[1 - swap], p2)});
    return w;
  }
  // +1 when the base's counter-clockwise corners follow the first query triangle's vertex order.
  int Direction(const int orient[2]) const { return orient[swap] * PermSign(p1); }
  bool SameOrientation(const int orient[2]) const { return Direction(orient) * orient[1 - swap] * PermSign(p2) > 0; }
};

const std::vector<int> kAllOrders{0, 1, 2, 3, 4, 5}, kApexFirst{0, 3};

// query(t1, t2, view) for both argument orders and the given vertex orders of each triangle; the first
// failure, with the query's triangles.
template <class P, class F> std::string ForEachView(const P *b1, const P *b2, const std::vector<int> &orders, F &&query)
{
  const P *b[2] = {b1, b2};
  for (int swap = 0; swap < 2; ++swap)
    for (int p1 : orders)
      for (int p2 : orders)
      {
        const P t1[3] = {b[swap][kPerm[p1][0]], b[swap][kPerm[p1][1]], b[swap][kPerm[p1][2]]};
        const P t2[3] = {b[1 - swap][kPerm[p2][0]], b[1 - swap][kPerm[p2][1]], b[1 - swap][kPerm[p2][2]]};
        const std::string why = query(t1, t2, View{swap, p1, p2});
        if (!why.empty())
          return "t1 " + Str3(t1) + " t2 " + Str3(t2) + ": " + why;
      }
  return {};
}

// query(t, p, q, want) for every vertex order of the triangle and both directions of the segment,
// with ends, the base answer from bp to bq, renumbered; the first failure, with the query.
template <class P, class F>
std::string ForEachSegmentView(const P b[3], const P &bp, const P &bq, const Pairs &ends, F &&query)
{
  for (int perm = 0; perm < 6; ++perm)
    for (int dir = 0; dir < 2; ++dir)
    {
      const P t[3] = {b[kPerm[perm][0]], b[kPerm[perm][1]], b[kPerm[perm][2]]};
      const P &p = dir ? bq : bp, &q = dir ? bp : bq;
      Pairs want;
      for (size_t k = 0; k < ends.size(); ++k)
      {
        Pair f = ends[dir ? ends.size() - 1 - k : k];
        f[0] = Renumber(f[0], perm);
        if (dir && f[1].type == 1)
          f[1].index = 1 - f[1].index;
        want.push_back(f);
      }
      const std::string why = query(t, p, q, want);
      if (!why.empty())
        return "triangle " + Str3(t) + " segment " + Str(p) + "->" + Str(q) + ": " + why;
    }
  return {};
}

// The eight forms of the segment pair (pt0 pt1), (pt2 pt3) as indices a, b, c, d: bit 0 of form
// exchanges the segments, bits 1 and 2 reverse the first and the second segment of the query.
inline std::array<int, 4> SegmentForm(int form)
{
  const int s = form & 1 ? 2 : 0, r0 = form >> 1 & 1, r1 = form >> 2 & 1;
  return {s + r0, s + 1 - r0, 2 - s + r1, 3 - s - r1};
}

// Copies and assignments hold the answer an intersector had, in storage of their own: first runs on
// the original, which is copied and assigned over a used intersector (and to itself), then second
// runs on the original, which is dropped. The copies still tell first's answer, answer second as the
// original did and pass that on to a copy of their own. Queries return their code; state(x) tells the
// rest of x's answer.
template <class Make, class Q1, class Q2, class State> void CheckCopies(Make make, Q1 first, Q2 second, State state)
{
  auto orig = make(), assigned = make();
  using T = typename decltype(orig)::element_type;
  second(*assigned);
  const int r1 = first(*orig);
  const std::string s1 = state(*orig);
  auto copy = std::make_unique<T>(*orig);
  *assigned = *orig;
  T &alias = *assigned;
  *assigned = alias;
  const int r2 = second(*orig);
  const std::string s2 = state(*orig);
  ASSERT_NE(std::to_string(r1) + s1, std::to_string(r2) + s2) << "the two queries must differ";
  orig.reset();
  EXPECT_EQ(state(*copy), s1);
  EXPECT_EQ(state(*assigned), s1);
  EXPECT_EQ(second(*copy), r2);
  EXPECT_EQ(state(*copy), s2);
  const T copyOfCopy(*copy);
  copy.reset();
  EXPECT_EQ(state(copyOfCopy), s2);
  EXPECT_EQ(first(*assigned), r1);
  EXPECT_EQ(state(*assigned), s1);
}

} // namespace oracle
