// The clash pipeline's tests: small scenes whose contacts are known, each also checked against the
// brute-force pass over every triangle pair, and the bunny against the brute-force pass.

#include "RKMClash.h"
#include "RKMMeshReader.h"

#include <gtest/gtest.h>

#include <cmath>
#include <set>
#include <tuple>

namespace
{
using namespace rkmclash;
using Point = std::array<double, 3>;

Mesh Tetrahedron(const Point &a, const Point &b, const Point &c, const Point &d)
{
  return Mesh{{a, b, c, d}, {{0, 2, 1}, {0, 1, 3}, {1, 2, 3}, {2, 0, 3}}, "tetra"};
}

PlacedMesh Placed(const Mesh &m, const RKMMathTransformation &t = RKMMathTransformation()) { return {m, t}; }

// The contacts of the pair of objects 0 and 1, with their kinds; none when the pair is not reported.
std::set<std::tuple<int, int, int>> Contacts(const std::vector<ObjectPairReport> &pairs)
{
  std::set<std::tuple<int, int, int>> keys;
  for (const ObjectPairReport &p : pairs)
    for (const TrianglePair &t : p.pairs)
      keys.insert({t.triangle[0], t.triangle[1], static_cast<int>(t.kind)});
  return keys;
}

ClashReport Clash(const std::vector<PlacedMesh> &meshes, bool gridded)
{
  ClashOptions options;
  options.gridded = gridded;
  ClashReport report;
  std::string error;
  EXPECT_TRUE(FindClashes(meshes, options, report, error)) << error;
  EXPECT_LE(report.pairs.size(), 1u);
  return report;
}

Mesh Bunny()
{
  Mesh m;
  std::string error;
  EXPECT_TRUE(ReadMesh(RKM_CLASH_BUNNY_PATH, m, error)) << error;
  return m;
}

TEST(RKMClash, SmallScenesHaveTheirKnownContacts)
{
  const Mesh corner = Tetrahedron({0, 0, 0}, {4, 0, 0}, {0, 4, 0}, {0, 0, 4});
  const Mesh square{{{0, 0, 0}, {2, 0, 0}, {2, 2, 0}, {0, 2, 0}}, {{0, 1, 2}, {0, 2, 3}}, "square"};
  struct Scene
  {
    const char *name;
    std::vector<PlacedMesh> meshes;
    long crossing, touching, coplanar;
  };
  const Scene scenes[] = {
      // Its three side faces each cross the slanted face x + y + z = 4, and nothing else meets.
      {"apex through a face",
       {Placed(corner), Placed(Tetrahedron({1, 1, 1}, {5, 2, 2}, {2, 5, 2}, {2, 2, 5}))},
       3,
       0,
       0},
      // Each face lies on its copy, and only touches the copies of the three faces that share an edge.
      {"a tetrahedron against itself", {Placed(corner), Placed(corner)}, 0, 12, 4},
      // Lower halves overlap, upper halves overlap; the crossed halves meet along the diagonal only.
      {"coplanar squares", {Placed(square), Placed(square, MakePlacement(1, 1, 0, 0, 0, 0))}, 0, 2, 2},
      {"far apart", {Placed(corner), Placed(corner, MakePlacement(1000, 0, 0, 0, 0, 0))}, 0, 0, 0},
  };
  for (const Scene &scene : scenes)
    for (bool gridded : {false, true})
    {
      SCOPED_TRACE(std::string(scene.name) + (gridded ? ", gridded" : ""));
      const ClashReport report = Clash(scene.meshes, gridded);
      ObjectPairReport got;
      if (!report.pairs.empty())
        got = report.pairs[0];
      EXPECT_EQ(std::make_tuple(got.crossing, got.touching, got.coplanar),
                std::make_tuple(scene.crossing, scene.touching, scene.coplanar));
      EXPECT_EQ(Contacts(report.pairs), Contacts({BruteForcePair(scene.meshes, 0, 1, gridded)}));
      EXPECT_EQ(got.curves.size(), static_cast<size_t>(scene.crossing));
      // Every curve point lies on the crossed face x + y + z = 4.
      for (const CurveSegment &s : got.curves)
        for (const Point &p : {s.from, s.to})
          EXPECT_NEAR(p[0] + p[1] + p[2], 4.0, 1e-9);
    }
}

TEST(RKMClash, BunnyScenesMatchBruteForce)
{
  const Mesh bunny = Bunny();
  ASSERT_EQ(bunny.triangles.size(), 3674u);
  const std::vector<PlacedMesh> meshes = {Placed(bunny), Placed(bunny, MakePlacement(0.9, 0.4, 0.3, 8.0, 25.0, 4.0))};
  for (bool gridded : {false, true})
  {
    const ClashReport report = Clash(meshes, gridded);
    ASSERT_EQ(report.pairs.size(), 1u);
    EXPECT_GT(report.pairs[0].crossing, 50) << gridded;
    const ObjectPairReport brute = BruteForcePair(meshes, 0, 1, gridded);
    EXPECT_EQ(Contacts(report.pairs), Contacts({brute})) << gridded;
    EXPECT_EQ(report.pairs[0].crossing, brute.crossing);
    // Far apart, the hierarchies keep every triangle pair from being tested.
    const ClashReport far = Clash({Placed(bunny), Placed(bunny, MakePlacement(1000, 0, 0, 0, 0, 0))}, gridded);
    EXPECT_TRUE(far.pairs.empty() || Contacts(far.pairs).empty());
    EXPECT_EQ(far.trianglePairsTested, 0);
  }
}

TEST(RKMClash, BadInputIsRefused)
{
  const Mesh t = Tetrahedron({0, 0, 0}, {4, 0, 0}, {0, 4, 0}, {0, 0, 4});
  Mesh bad = t, nan = t;
  bad.triangles.push_back({0, 1, 7});
  nan.vertices[2][1] = std::nan("");
  ClashReport report;
  std::string error;
  EXPECT_FALSE(FindClashes({Placed(t)}, ClashOptions(), report, error));
  EXPECT_FALSE(FindClashes({Placed(t), Placed(bad)}, ClashOptions(), report, error));
  EXPECT_NE(error.find("tetra"), std::string::npos) << error;
  EXPECT_FALSE(FindClashes({Placed(t), Placed(nan)}, ClashOptions(), report, error));
  EXPECT_NE(error.find("not finite"), std::string::npos) << error;
}
} // namespace
