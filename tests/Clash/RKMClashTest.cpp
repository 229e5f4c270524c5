// The clash pipeline's tests: small scenes whose contacts are known, and the bunny against the
// brute-force reference.

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <set>
#include <string>
#include <tuple>
#include <vector>

#include "RKMClash.h"
#include "RKMMeshReader.h"

namespace
{
using namespace rkmclash;

Mesh Tetrahedron(const std::array<double, 3> &a, const std::array<double, 3> &b, const std::array<double, 3> &c,
                 const std::array<double, 3> &d, const std::string &name)
{
  Mesh m;
  m.vertices = {a, b, c, d};
  m.triangles = {{0, 2, 1}, {0, 1, 3}, {1, 2, 3}, {2, 0, 3}};
  m.name = name;
  return m;
}

PlacedMesh Placed(const Mesh &m, const RKMMathTransformation &t = RKMMathTransformation())
{
  PlacedMesh p;
  p.mesh = m;
  p.placement = t;
  return p;
}

struct Totals
{
  long crossing = 0, touching = 0, coplanar = 0;
};

Totals RunScene(const std::vector<PlacedMesh> &meshes, bool gridded, ClashReport *out = nullptr)
{
  ClashOptions options;
  options.gridded = gridded;
  ClashReport report;
  std::string error;
  EXPECT_TRUE(FindClashes(meshes, options, report, error)) << error;
  Totals t;
  for (const ObjectPairReport &p : report.pairs)
  {
    t.crossing += p.crossing;
    t.touching += p.touching;
    t.coplanar += p.coplanar;
  }
  if (out)
    *out = report;
  return t;
}

Mesh Bunny()
{
  Mesh m;
  std::string error;
  EXPECT_TRUE(ReadMesh(RKM_CLASH_BUNNY_PATH, m, error)) << error;
  return m;
}

using PairKey = std::tuple<int, int, int>;

std::set<PairKey> Keys(const ObjectPairReport &p)
{
  std::set<PairKey> keys;
  for (const TrianglePair &t : p.pairs)
    keys.insert({t.triangle[0], t.triangle[1], static_cast<int>(t.kind)});
  return keys;
}
} // namespace

// A tetrahedron whose apex pokes through the slanted face of another: its three side faces each
// cross that face, and nothing else meets.
TEST(RKMClash, TetrahedronPokingThroughAFace)
{
  const Mesh t1 = Tetrahedron({0, 0, 0}, {4, 0, 0}, {0, 4, 0}, {0, 0, 4}, "corner");
  const Mesh t2 = Tetrahedron({1, 1, 1}, {5, 2, 2}, {2, 5, 2}, {2, 2, 5}, "spike");
  for (bool gridded : {false, true})
  {
    ClashReport report;
    const Totals t = RunScene({Placed(t1), Placed(t2)}, gridded, &report);
    EXPECT_EQ(t.crossing, 3) << gridded;
    EXPECT_EQ(t.touching, 0) << gridded;
    EXPECT_EQ(t.coplanar, 0) << gridded;
    ASSERT_EQ(report.pairs.size(), 1u);
    EXPECT_EQ(report.pairs[0].curves.size(), 3u);
    // Every curve point lies on the slanted face x + y + z = 4.
    for (const CurveSegment &s : report.pairs[0].curves)
      for (const auto &p : {s.from, s.to})
        EXPECT_NEAR(p[0] + p[1] + p[2], 4.0, 1e-9);
  }
}

TEST(RKMClash, FarApartMeshesDoNotMeet)
{
  const Mesh bunny = Bunny();
  for (bool gridded : {false, true})
  {
    ClashReport report;
    const Totals t = RunScene({Placed(bunny), Placed(bunny, MakePlacement(1000, 0, 0, 0, 0, 0))}, gridded, &report);
    EXPECT_EQ(t.crossing + t.touching + t.coplanar, 0);
    EXPECT_EQ(report.trianglePairsTested, 0);
  }
}

// Identical placement: each triangle lies on its copy (a coplanar overlap), its neighbours' copies
// only touch it, and nothing crosses.
TEST(RKMClash, MeshAgainstItselfOnlyTouches)
{
  const Mesh t = Tetrahedron({0, 0, 0}, {4, 0, 0}, {0, 4, 0}, {0, 0, 4}, "tetra");
  for (bool gridded : {false, true})
  {
    const Totals totals = RunScene({Placed(t), Placed(t)}, gridded);
    EXPECT_EQ(totals.crossing, 0);
    EXPECT_EQ(totals.coplanar, 4);
    // Every two faces of a tetrahedron share an edge.
    EXPECT_EQ(totals.touching, 12);
  }
}

TEST(RKMClash, OverlappingCoplanarSquares)
{
  Mesh a;
  a.vertices = {{0, 0, 0}, {2, 0, 0}, {2, 2, 0}, {0, 2, 0}};
  a.triangles = {{0, 1, 2}, {0, 2, 3}};
  a.name = "a";
  Mesh b = a;
  b.name = "b";
  for (bool gridded : {false, true})
  {
    const Totals t = RunScene({Placed(a), Placed(b, MakePlacement(1, 1, 0, 0, 0, 0))}, gridded);
    EXPECT_EQ(t.crossing, 0);
    // Lower halves overlap, upper halves overlap; the crossed halves meet along the diagonal only.
    EXPECT_EQ(t.coplanar, 2);
    EXPECT_EQ(t.touching, 2);
  }
}

// The hierarchy walk finds exactly the contacts that testing every pair of triangles finds.
TEST(RKMClash, BunnySceneMatchesBruteForce)
{
  const Mesh bunny = Bunny();
  ASSERT_EQ(bunny.triangles.size(), 3674u);
  const std::vector<PlacedMesh> meshes = {Placed(bunny), Placed(bunny, MakePlacement(0.9, 0.4, 0.3, 8.0, 25.0, 4.0))};
  for (bool gridded : {false, true})
  {
    ClashReport report;
    const Totals t = RunScene(meshes, gridded, &report);
    EXPECT_GT(t.crossing, 50) << gridded;
    ASSERT_EQ(report.pairs.size(), 1u);
    const ObjectPairReport brute = BruteForcePair(meshes, 0, 1, gridded);
    EXPECT_EQ(Keys(report.pairs[0]), Keys(brute)) << gridded;
    EXPECT_EQ(report.pairs[0].crossing, brute.crossing);
  }
}

TEST(RKMClash, BadInputIsRefused)
{
  const Mesh t = Tetrahedron({0, 0, 0}, {4, 0, 0}, {0, 4, 0}, {0, 0, 4}, "tetra");
  ClashReport report;
  std::string error;
  EXPECT_FALSE(FindClashes({Placed(t)}, ClashOptions(), report, error));
  Mesh bad = t;
  bad.triangles.push_back({0, 1, 7});
  EXPECT_FALSE(FindClashes({Placed(t), Placed(bad)}, ClashOptions(), report, error));
  EXPECT_NE(error.find("tetra"), std::string::npos) << error;
  Mesh nan = t;
  nan.vertices[2][1] = std::nan("");
  EXPECT_FALSE(FindClashes({Placed(t), Placed(nan)}, ClashOptions(), report, error));
  EXPECT_NE(error.find("not finite"), std::string::npos) << error;
}
