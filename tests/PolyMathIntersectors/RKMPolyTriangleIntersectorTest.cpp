#include "RKMPolyTriangleIntersector.h"

#include "ExactSpaceOracle.h"
#include "IntersectSweep.h"
#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyNormalizeUtils.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace
{
using namespace oracle;
using P = RKMMathPoint;
using Inter = RKMPolyTriangleIntersector;
using space::Q3;

// One base pair in the given vertex orders of each triangle and both argument orders, against the
// exact reference: the code, the points as feature pairs (a coplanar polygon's in cyclic order along
// the first triangle's direction), coplanarity and, for coplanar pairs, the orientations. A flat
// triangle is refused, or the pair is apart when the first triangle lies strictly on one side of the
// second one's plane; a refusal offers no points. The pointer entry point must give the same points;
// with fivePoint the triangles share vertex 0 and the five-point entry point answers first.
std::string CheckPair(Inter &tri, const P b1[3], const P b2[3], const std::vector<int> &orders, bool fivePoint,
                      Seen &seen)
{
  const Q3 q1[3] = {space::Q(b1[0]), space::Q(b1[1]), space::Q(b1[2])};
  const Q3 q2[3] = {space::Q(b2[0]), space::Q(b2[1]), space::Q(b2[2])};
  const space::SpaceAnswer ans = space::IntersectTriangles(q1, q2);
  static const char *const kKinds[] = {"apart", "point", "segment"};
  seen(ans.result < 0 ? "degenerate" : ans.coplanar ? "coplanar " + std::to_string(ans.result) : kKinds[ans.result]);
  if (!ans.coplanar)
    for (const Pair &f : ans.features)
      seen(Str(f[0]).substr(0, 1) + "x" + Str(f[1]).substr(0, 1));
  // By argument order: whether a degenerate pair may be apart.
  bool apartOk[2] = {false, false};
  for (int swap = 0; swap < 2 && ans.result == -6; ++swap)
  {
    const Q3 *first = swap ? q2 : q1, *second = swap ? q1 : q2;
    int side[3] = {};
    for (int k = 0; k < 3; ++k)
      side[k] = space::Orient(second[0], second[1], second[2], first[k]);
    apartOk[swap] = !space::Degenerate(second) && side[0] != 0 && side[0] == side[1] && side[1] == side[2];
  }
  return ForEachView(b1, b2, orders, [&](const P *t1, const P *t2, const View &v) {
    const int got = fivePoint ? tri.Intersect(t1[0], t1[1], t1[2], t2[1], t2[2])
                              : tri.Intersect(t1[0], t1[1], t1[2], t2[0], t2[1], t2[2]);
    const Pairs pts = Read(tri);
    const bool coplanar = tri.AreTrianglesCoplanar(), same = tri.HaveSameOrientation();
    if (tri.Intersect(t1, t2) != got || !Match(Read(tri), pts, fivePoint ? Order::Any : Order::Exact).empty())
      return "Intersect(t1, t2) gives " + Str(Read(tri)) + (fivePoint ? ", five-point " : ", six-point ") + Str(pts);
    if (got != ans.result && !(apartOk[v.swap] && got == 0))
      return "result " + std::to_string(got) + ", expected " + std::to_string(ans.result);
    if (got > 0 && coplanar != ans.coplanar)
      return std::string("AreTrianglesCoplanar ") + (coplanar ? "1" : "0");
    if (got > 0 && ans.coplanar && same != v.SameOrientation(ans.orient))
      return std::string("HaveSameOrientation ") + (same ? "1" : "0");
    return Match(pts, got > 0 ? v.Of(ans.features) : Pairs(), ans.coplanar && got == 3 ? Order::Cyclic : Order::Any,
                 v.Direction(ans.orient));
  });
}

// Random pairs of triangles on a few grid points: shared vertices and edges, vertices on edges and
// faces, edges lying in the other plane, coplanar overlaps and flat triangles all come up often. With
// fivePoint the two triangles share their first vertex: never apart.
Seen RunSweep(const SweepCase &c, bool fivePoint)
{
  RKMPolyExactArithmetic arith(c.mode);
  Inter tri(arith);
  Seen seen;
  Sweep<3>(c, space::kScale, [&](space::PointSource &src) {
    P t1[3], t2[3];
    for (P &p : t1)
      p = src.Next();
    for (P &p : t2)
      p = src.Next();
    if (fivePoint)
      t2[0] = t1[0];
    return CheckPair(tri, t1, t2, fivePoint ? kApexFirst : kAllOrders, fivePoint, seen);
  });
  seen.Expect({"point", "segment"});
  if (c.layout == Layout::Extreme)
    seen.Expect({"coplanar 3"});
  return seen;
}

using TriangleSpaceSweep = SweepTest;
TEST_P(TriangleSpaceSweep, MatchesExactReference)
{
  const Seen seen = RunSweep(GetParam(), false);
  seen.Expect({"apart"});
  // Grid data must reach every contact: each feature type against each, every coplanar answer, flat
  // triangles.
  if (GetParam().layout == Layout::SmallGrid && space::kScale == 1)
    seen.Expect({"VxV", "VxB", "VxT", "BxV", "BxB", "BxT", "TxV", "TxB", "coplanar 0", "coplanar 1", "coplanar 2",
                 "coplanar 3", "degenerate"});
}
TEST_P(TriangleSpaceSweep, SharedVertexFivePointMatchesExactReference)
{
  const Seen seen = RunSweep(GetParam(), true);
  EXPECT_FALSE(seen.Met("apart"));
  if (GetParam().layout == Layout::SmallGrid && space::kScale == 1)
    seen.Expect({"coplanar 1", "coplanar 2", "coplanar 3", "degenerate"});
}
RKM_SWEEPS(TriangleSpaceSweep,
           SweepCase{kGridded, kSmallGrid, 2, 8000, 301}, SweepCase{kAdaptive, kSmallGrid, 2, 8000, 302},
           SweepCase{kGridded, kSmallGrid, 3, 8000, 303}, SweepCase{kAdaptive, kSmallGrid, 3, 8000, 304},
           SweepCase{kGridded, kLattice, 2, 3000, 305}, SweepCase{kAdaptive, kLattice, 3, 3000, 306},
           SweepCase{kAdaptive, kSkewed, 3, 3000, 307}, SweepCase{kAdaptive, kExtreme, 2, 3000, 308});

struct Known
{
  const P *t1, *t2;
  int result;
  const char *points; // in any order
  int coplanar = -1;  // -1: not looked at
  int same = -1;
  bool fivePoint = false; // t1[0] shared, t2[0] unused
};

void CheckKnown(Inter &tri, const Known &k, const std::string &where)
{
  const std::string what = where + " t1 " + Str3(k.t1) + " t2 " + Str3(k.t2) + (k.fivePoint ? " five-point" : "");
  EXPECT_EQ(k.fivePoint ? tri.Intersect(k.t1[0], k.t1[1], k.t1[2], k.t2[1], k.t2[2]) : tri.Intersect(k.t1, k.t2),
            k.result)
      << what;
  EXPECT_EQ(Unordered(tri), k.points) << what;
  EXPECT_TRUE(k.coplanar < 0 || tri.AreTrianglesCoplanar() == k.coplanar) << what;
  EXPECT_TRUE(k.same < 0 || tri.HaveSameOrientation() == k.same) << what;
}

// One triangle in z = 0 against triangles that pierce it, share a vertex or an edge with it, rest a
// vertex or lay an edge on it, or lie above or beside it; in the plane x + y + z = 4 against triangles
// inside it either way round, sharing an edge or a vertex, or beside it. Flat triangles are refused,
// unless the flat first triangle lies strictly on one side, and a refusal offers none of the points the
// query before it found.
TEST(TriangleSpace, KnownCases)
{
  const P base[3] = {{0, 0, 0}, {4, 0, 0}, {0, 4, 0}};
  const P upright[3] = {{1, 1, -1}, {2, 1, 1}, {0, 1, 1}}, corner[3] = {{0, 0, 0}, {-1, 0, -2}, {0, -1, -2}};
  const P hinge[3] = {{4, 0, 0}, {0, 0, 0}, {0, 0, 4}}, onFace[3] = {{1, 1, 0}, {1, 2, 2}, {2, 1, 2}};
  const P onBar[3] = {{3, 2, 3}, {2, 2, 0}, {2, 3, 3}}, lying[3] = {{1, 1, 0}, {2, 1, 0}, {1, 1, 3}};
  const P along[3] = {{0, 2, 0}, {0, 6, 0}, {0, 4, 2}}, above[3] = {{0, 0, 1}, {4, 0, 1}, {0, 4, 1}};
  const P beside[3] = {{5, 5, -1}, {6, 5, 1}, {5, 6, 1}}, a[3] = {{4, 0, 0}, {0, 4, 0}, {0, 0, 4}};
  const P b[3] = {{2, 2, 0}, {0, 2, 2}, {2, 0, 2}}, bReversed[3] = {b[0], b[2], b[1]};
  const P across[3] = {{4, 0, 0}, {0, 4, 0}, {4, 4, -4}}, tip[3] = {{4, 0, 0}, {8, 0, -4}, {6, 2, -4}};
  const P away[3] = {{8, 0, -4}, {6, 2, -4}, {8, 2, -6}}, flatIn[3] = {{1, 1, 0}, {2, 2, 0}, {3, 3, 0}};
  const P flatAcross[3] = {{1, 1, -1}, {1, 1, 1}, {1, 1, 2}}, flatAbove[3] = {{1, 1, 1}, {2, 2, 1}, {3, 3, 1}};
  const P point[3] = {{1, 1, 0}, {1, 1, 0}, {1, 1, 0}}, flatAt0[3] = {base[0], {1, 1, 1}, {2, 2, 2}};
  const P flatAt0In[3] = {base[0], {1, 1, 0}, {2, 2, 0}};
  const Known cases[] = {{base, upright, 2, "T0xB0 T0xB2", 0},
                         {upright, base, 2, "B0xT0 B2xT0", 0},
                         {base, corner, 1, "V0xV0", 0},
                         {base, corner, 1, "V0xV0", 0, -1, true},
                         {base, hinge, 2, "V0xV1 V1xV0", 0},
                         {base, onFace, 1, "T0xV0"},
                         {base, onBar, 1, "B1xV1"},
                         {base, lying, 2, "T0xV0 T0xV1"},
                         {base, along, 2, "V2xB0 B2xV0"},
                         {base, above, 0, ""},
                         {base, beside, 0, ""},
                         {a, b, 3, "B0xV0 B1xV1 B2xV2", 1, 1},
                         {a, bReversed, 3, "B0xV0 B1xV2 B2xV1", 1, 0},
                         {a, across, 2, "V0xV0 V1xV1", 1},
                         {a, tip, 1, "V0xV0", 1},
                         {a, away, 0, "", 1},
                         {a, b, 3, "B0xV0 B1xV1 B2xV2", 1, 1},
                         {base, flatIn, -6, ""},
                         {flatIn, base, -6, ""},
                         {base, flatAcross, -6, ""},
                         {flatAcross, base, -6, ""},
                         {base, flatAbove, -6, ""},
                         {flatAbove, base, 0, ""},
                         {base, point, -6, ""},
                         {point, point, -6, ""},
                         {base, flatAt0, -6, "", -1, -1, true},
                         {flatAt0, base, -6, "", -1, -1, true},
                         {flatAt0In, base, -6, "", -1, -1, true}};
  for (Mode m : kModes)
  {
    RKMPolyExactArithmetic arith(m);
    Inter tri(arith);
    for (const Known &k : cases)
      CheckKnown(tri, k, ModeName(m));
    Inter fresh(arith);
    CheckKnown(fresh, {flatIn, base, -6, ""}, ModeName(m));
    // Copies hold a coplanar answer, then one off the plane, in their own storage.
    CheckCopies([&] { return std::make_unique<Inter>(arith); }, [&](Inter &x) { return x.Intersect(a, b); },
                [&](Inter &x) { return x.Intersect(base, upright); },
                [](const Inter &x) {
                  return Str(Read(x)) + " coplanar " + std::to_string(x.AreTrianglesCoplanar()) + " same " +
                         std::to_string(x.HaveSameOrientation());
                });
  }
}

// Where doubles fail the Adaptive mode is exact: coplanar pairs far below and far above 1, whose
// plane's normal does not fit in a double, and a thin but proper triangle in the plane x = 0 whose
// normal, (-1, 0, 0), rounds to zero ((2^27 + 1)(2^27 - 1) rounds to 2^54). Sharing the sliver's edge
// from the other side, the answer comes with the sliver either first or second.
TEST(TriangleSpace, ExtremeAndSliverPairsAreNotRefused)
{
  RKMPolyExactArithmetic arith(kAdaptive);
  Inter tri(arith);
  const double s = std::ldexp(1.0, -540), h = std::ldexp(1.0, 520), t = std::ldexp(1.0, 27);
  const P tiny1[3] = {{0, 0, 0}, {4 * s, 0, 0}, {0, 4 * s, 0}}, tiny2[3] = {{s, s, 0}, {5 * s, s, 0}, {s, 5 * s, 0}};
  const P huge1[3] = {{0, 0, 0}, {4 * h, 0, h}, {h, 0, 4 * h}};
  const P huge2[3] = {{h, 0, h}, {5 * h, 0, 2 * h}, {2 * h, 0, 5 * h}};
  const P sliver[3] = {{0, 0, 0}, {0, t + 1, t}, {0, t, t - 1}}, nextTo[3] = {{0, 0, 0}, {0, t + 1, t}, {0, 0, t}};
  ASSERT_EQ(arith.Orientation3D(sliver[0], sliver[1], sliver[2], P(1, 0, 0)), -1);
  CheckKnown(tri, {tiny1, tiny2, 3, "B1xB0 B1xB2 T0xV0", 1}, "");
  CheckKnown(tri, {huge1, huge2, 3, "B1xB0 B1xB2 T0xV0", 1}, "");
  CheckKnown(tri, {sliver, sliver, 3, "V0xV0 V1xV1 V2xV2", 1}, "");
  CheckKnown(tri, {nextTo, sliver, 2, "V0xV0 V1xV1", 1}, "");
  CheckKnown(tri, {sliver, nextTo, 2, "V0xV0 V1xV1", 1}, "");
}

// Without an arithmetic every query is refused with no points, and nothing is coplanar, oriented or
// placed; copies and assignments carry the arithmetic, or its absence, along.
TEST(TriangleSpace, WithoutArithmetic)
{
  const P base[3] = {{0, 0, 0}, {6, 0, 0}, {0, 6, 0}}, inside[3] = {{1, 1, 0}, {2, 1, 0}, {1, 2, 0}};
  const P overlap[3] = {{1, 1, 0}, {7, 1, 0}, {1, 7, 0}};
  RKMPolyExactArithmetic arith;
  Inter none(static_cast<const RKMPolyExactArithmetic *>(nullptr)), some(arith);
  CheckKnown(none, {base, overlap, -1, "", 0, 0}, "");
  CheckKnown(none, {base, overlap, -1, "", 0, 0, true}, "");
  EXPECT_EQ(none.Intersect(base[0], base[1], base[2], overlap[0], overlap[1], overlap[2]), -1);
  EXPECT_EQ(none.GetPosition(base[0], base[1], base[2], P(1, 1, -1)), 0);
  Inter copy(none);
  CheckKnown(copy, {base, inside, -1, ""}, "");
  copy = some;
  CheckKnown(copy, {base, inside, 3, "T0xV0 T0xV1 T0xV2", 1}, "");
  copy = none;
  CheckKnown(copy, {base, inside, -1, ""}, "");
}

// Closed meshes with coordinates rounded to doubles: an icosphere and a torus, each against itself
// (neighbours share edges and vertices exactly) and against a copy turned by a few degrees and shifted
// by a fraction, so that faces cross at arbitrary angles.
struct Mesh
{
  std::vector<P> points;
  std::vector<std::array<int, 3>> faces;
};

P Unit(const P &p)
{
  const double l = std::sqrt(p.x * p.x + p.y * p.y + p.z * p.z);
  return P(p.x / l, p.y / l, p.z / l);
}

Mesh Icosphere(int levels)
{
  const double g = (1.0 + std::sqrt(5.0)) / 2.0;
  Mesh m{{{-1, g, 0}, {1, g, 0}, {-1, -g, 0}, {1, -g, 0}, {0, -1, g}, {0, 1, g}, {0, -1, -g}, {0, 1, -g}, {g, 0, -1},
          {g, 0, 1}, {-g, 0, -1}, {-g, 0, 1}},
         {{0, 11, 5}, {0, 5, 1}, {0, 1, 7}, {0, 7, 10}, {0, 10, 11}, {1, 5, 9}, {5, 11, 4}, {11, 10, 2}, {10, 7, 6},
          {7, 1, 8}, {3, 9, 4}, {3, 4, 2}, {3, 2, 6}, {3, 6, 8}, {3, 8, 9}, {4, 9, 5}, {2, 4, 11}, {6, 2, 10},
          {8, 6, 7}, {9, 8, 1}}};
  for (P &p : m.points)
    p = Unit(p);
  for (int l = 0; l < levels; ++l)
  {
    std::vector<std::array<int, 3>> next;
    std::map<std::pair<int, int>, int> mid;
    auto middle = [&](int a, int b) {
      const auto key = std::minmax(a, b);
      if (!mid.count(key))
      {
        const P &pa = m.points[a], &pb = m.points[b];
        m.points.push_back(Unit(P((pa.x + pb.x) / 2, (pa.y + pb.y) / 2, (pa.z + pb.z) / 2)));
        mid[key] = static_cast<int>(m.points.size()) - 1;
      }
      return mid[key];
    };
    for (const auto &f : m.faces)
    {
      const int a = middle(f[0], f[1]), b = middle(f[1], f[2]), c = middle(f[2], f[0]);
      next.insert(next.end(), {{f[0], a, c}, {f[1], b, a}, {f[2], c, b}, {a, b, c}});
    }
    m.faces = next;
  }
  return m;
}

Mesh Torus(int around, int across, double R, double r)
{
  Mesh m;
  const double pi = std::acos(-1.0);
  for (int i = 0; i < around; ++i)
    for (int j = 0; j < across; ++j)
    {
      const double u = 2 * pi * i / around, v = 2 * pi * j / across;
      m.points.push_back({(R + r * std::cos(v)) * std::cos(u), (R + r * std::cos(v)) * std::sin(u), r * std::sin(v)});
      const int a = i * across + j, b = ((i + 1) % around) * across + j;
      const int c = ((i + 1) % around) * across + (j + 1) % across, d = i * across + (j + 1) % across;
      m.faces.insert(m.faces.end(), {{a, b, c}, {a, c, d}});
    }
  return m;
}

// Turned by angle (radians) about the axis, then shifted; every coordinate rounds to a double.
Mesh Moved(const Mesh &m, P axis, double angle, P shift)
{
  const P n = Unit(axis);
  const double x = n.x, y = n.y, z = n.z, c = std::cos(angle), s = std::sin(angle), t = 1 - c;
  const double r[3][3] = {{t * x * x + c, t * x * y - s * z, t * x * z + s * y},
                          {t * x * y + s * z, t * y * y + c, t * y * z - s * x},
                          {t * x * z - s * y, t * y * z + s * x, t * z * z + c}};
  Mesh out = m;
  for (P &p : out.points)
  {
    const P q = p;
    for (int k = 0; k < 3; ++k)
      p[k] = r[k][0] * q.x + r[k][1] * q.y + r[k][2] * q.z + shift[k];
  }
  return out;
}

// Every face of one mesh against every face of the other: pairs whose boxes meet go through the full
// check (fewer vertex orders where each query costs more), the others must simply be apart.
void CheckMeshes(Inter &tri, const Mesh &a, const Mesh &b, bool same, Seen &seen, int &reported, const char *what)
{
  for (size_t i = 0; i < a.faces.size(); ++i)
    for (size_t j = same ? i : 0; j < b.faces.size(); ++j)
    {
      const P t1[3] = {a.points[a.faces[i][0]], a.points[a.faces[i][1]], a.points[a.faces[i][2]]};
      const P t2[3] = {b.points[b.faces[j][0]], b.points[b.faces[j][1]], b.points[b.faces[j][2]]};
      bool boxesMeet = true;
      for (int k = 0; k < 3; ++k)
        boxesMeet = boxesMeet && std::max({t1[0][k], t1[1][k], t1[2][k]}) >= std::min({t2[0][k], t2[1][k], t2[2][k]}) &&
                    std::max({t2[0][k], t2[1][k], t2[2][k]}) >= std::min({t1[0][k], t1[1][k], t1[2][k]});
      std::string why;
      if (boxesMeet)
        why = CheckPair(tri, t1, t2, space::kScale > 1 ? kApexFirst : kAllOrders, false, seen);
      else if (const int r = tri.Intersect(t1, t2))
        why = "t1 " + Str3(t1) + " t2 " + Str3(t2) + ": boxes apart, got " + std::to_string(r);
      if (!why.empty() && reported++ < 5)
        ADD_FAILURE() << what << " faces " << i << ", " << j << ": " << why;
    }
}

struct MeshCase
{
  Mode mode;
  bool torus;
};

class TriangleMeshes : public testing::TestWithParam<MeshCase>
{
};

TEST_P(TriangleMeshes, CrossingFacesMatchExactReference)
{
  const MeshCase c = GetParam();
  // Fewer faces where each query costs more.
  const bool small = space::kScale > 1;
  Mesh a = c.torus ? Torus(small ? 8 : 16, small ? 6 : 8, 1.0, 0.4) : Icosphere(small ? 1 : 2);
  Mesh b = Moved(a, P(1, 2, 3), 3.0 * std::acos(-1.0) / 180.0, P(0.13, 0.071, -0.052));
  RKMPolyExactArithmetic arith(c.mode);
  if (c.mode == kGridded)
  {
    // The Gridded mode is exact on grid coordinates only: snap both meshes together onto the grid
    // their common box calls for.
    std::vector<P> all = a.points;
    all.insert(all.end(), b.points.begin(), b.points.end());
    RKMMathBox box;
    RKMPolyExactArithmetic *ap = &arith;
    ASSERT_EQ(RKMPolyNormalizeUtils::NormalizePoints(all.data(), static_cast<int>(all.size()), box, ap), S_OK);
    ASSERT_EQ(ap, &arith);
    std::copy(all.begin(), all.begin() + a.points.size(), a.points.begin());
    std::copy(all.begin() + a.points.size(), all.end(), b.points.begin());
  }
  Inter tri(arith);
  Seen seen;
  int reported = 0;
  CheckMeshes(tri, a, a, true, seen, reported, "mesh with itself");
  CheckMeshes(tri, b, b, true, seen, reported, "moved copy with itself");
  const long selfSegments = seen.n["segment"];
  CheckMeshes(tri, a, b, false, seen, reported, "mesh with moved copy");
  EXPECT_EQ(reported, 0);
  // Each face meets itself, and its neighbours along an edge or at a vertex; the copy's faces cross the
  // original's along the curve where the surfaces meet.
  EXPECT_GE(seen.n["coplanar 3"], static_cast<long>(2 * a.faces.size()));
  EXPECT_GT(selfSegments, 0);
  EXPECT_GT(seen.n["segment"] - selfSegments, 20);
}

INSTANTIATE_TEST_SUITE_P(Meshes, TriangleMeshes,
                         testing::Values(MeshCase{kAdaptive, false}, MeshCase{kAdaptive, true},
                                         MeshCase{kGridded, false}, MeshCase{kGridded, true}),
                         [](const testing::TestParamInfo<MeshCase> &i) {
                           return std::string(ModeName(i.param.mode)) + (i.param.torus ? "_Torus" : "_Icosphere");
                         });

} // namespace
