// Overlap tests of the pairs a hierarchy walk uses most, ours against FCL's box tests on the same
// random pairs: float boxes unplaced and placed, oriented boxes, spheres. About a third of the pairs
// overlap.
#include "RKMMathBox.h"
#include "RKMMathTransformation.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

#include <benchmark/benchmark.h>
#include <fcl/math/bv/AABB.h>
#include <fcl/math/bv/OBB.h>

#include <cmath>
#include <random>
#include <vector>

namespace
{
constexpr int kPairs = 4096;

RKMMath3x3Matrix RandomRotation(std::mt19937_64 &rng)
{
  std::normal_distribution<double> n(0.0, 1.0);
  double q[4] = {n(rng), n(rng), n(rng), n(rng)};
  const double len = std::sqrt(q[0] * q[0] + q[1] * q[1] + q[2] * q[2] + q[3] * q[3]);
  for (double &v : q)
    v /= len;
  const double w = q[0], x = q[1], y = q[2], z = q[3];
  return RKMMath3x3Matrix(1 - 2 * (y * y + z * z), 2 * (x * y - z * w), 2 * (x * z + y * w),
                          2 * (x * y + z * w), 1 - 2 * (x * x + z * z), 2 * (y * z - x * w),
                          2 * (x * z - y * w), 2 * (y * z + x * w), 1 - 2 * (x * x + y * y));
}

fcl::Matrix3d ToEigen(const RKMMath3x3Matrix &m)
{
  fcl::Matrix3d r;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      r(i, j) = m(i, j);
  return r;
}

struct Scene
{
  std::vector<RKMPolyAABB> boxes;
  std::vector<RKMPolyOBB> obbs;
  std::vector<RKMPolyBoundingSphere> spheres;
  std::vector<RKMMathTransformation> placements;
  std::vector<fcl::AABBd> fclBoxes;
  std::vector<fcl::OBBd> fclObbs, fclBoxObbs;

  Scene()
  {
    std::mt19937_64 rng(20261206);
    std::uniform_real_distribution<double> centre(0.0, 10.0), size(0.2, 2.5);
    for (int i = 0; i < kPairs; ++i)
    {
      const RKMMathPoint c(centre(rng), centre(rng), centre(rng));
      const RKMMathVector h(size(rng), size(rng), size(rng));
      const RKMMathBox box(c.x - h.x, c.x + h.x, c.y - h.y, c.y + h.y, c.z - h.z, c.z + h.z);
      boxes.emplace_back(box);
      fclBoxes.emplace_back(fcl::Vector3d(c.x - h.x, c.y - h.y, c.z - h.z), fcl::Vector3d(c.x + h.x, c.y + h.y, c.z + h.z));
      const RKMMath3x3Matrix R = RandomRotation(rng);
      const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
      obbs.emplace_back(axes, h, c);
      fclObbs.emplace_back(ToEigen(R), fcl::Vector3d(c.x, c.y, c.z), fcl::Vector3d(h.x, h.y, h.z));
      spheres.emplace_back(c, h.x);
      // A rigid placement of the box; FCL takes the box as an oriented box on the world axes.
      const RKMMath3x3Matrix P = RandomRotation(rng);
      const RKMMathVector t(centre(rng) * 0.1, centre(rng) * 0.1, centre(rng) * 0.1);
      placements.emplace_back(P, t);
      fclBoxObbs.emplace_back(fcl::Matrix3d::Identity(), fcl::Vector3d(c.x, c.y, c.z), fcl::Vector3d(h.x, h.y, h.z));
    }
  }
};

const Scene &TheScene()
{
  static const Scene scene;
  return scene;
}

template <class Test>
void Run(benchmark::State &state, Test test)
{
  const Scene &s = TheScene();
  int i = 0;
  long hits = 0;
  for (auto _ : state)
  {
    for (int k = 1; k <= 64; ++k)
      hits += test(s, i, (i + k) % kPairs);
    i = (i + 1) % kPairs;
  }
  benchmark::DoNotOptimize(hits);
  state.SetItemsProcessed(state.iterations() * 64);
}

void BM_Ours_AABB_AABB(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) {
    return RKMPolyBVBVOperations::BVOverLap(&s.boxes[a], &s.boxes[b], 0.0, nullptr, nullptr);
  });
}
void BM_FCL_AABB_AABB(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.fclBoxes[a].overlap(s.fclBoxes[b]); });
}
void BM_Ours_AABB_AABB_Placed(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) {
    return RKMPolyBVBVOperations::BVOverLap(&s.boxes[a], &s.boxes[b], 0.0, &s.placements[a], &s.placements[b]);
  });
}
// FCL given the same work: the boxes as oriented boxes and the relative placement of the pair.
void BM_FCL_AABB_AABB_Placed(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) {
    const fcl::Matrix3d Ra = ToEigen(s.placements[a].GetMatrix()), Rb = ToEigen(s.placements[b].GetMatrix());
    const RKMMathVector &ta = s.placements[a].GetTranslation(), &tb = s.placements[b].GetTranslation();
    const fcl::Matrix3d R = Rb.transpose() * Ra;
    const fcl::Vector3d T = Rb.transpose() * fcl::Vector3d(ta.x - tb.x, ta.y - tb.y, ta.z - tb.z);
    return fcl::overlap(R, T, s.fclBoxObbs[a], s.fclBoxObbs[b]);
  });
}
void BM_Ours_OBB_OBB(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) {
    return RKMPolyBVBVOperations::BVOverLap(&s.obbs[a], &s.obbs[b], 0.0, nullptr, nullptr);
  });
}
void BM_Ours_OBB_Test(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.obbs[a].Test(s.obbs[b]) == RKMPolyOBB::OBBIntersecting; });
}
void BM_FCL_OBB_OBB(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.fclObbs[a].overlap(s.fclObbs[b]); });
}
void BM_Ours_Sphere_Sphere(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) {
    return RKMPolyBVBVOperations::BVOverLap(&s.spheres[a], &s.spheres[b], 0.0, nullptr, nullptr);
  });
}
}

BENCHMARK(BM_Ours_AABB_AABB);
BENCHMARK(BM_FCL_AABB_AABB);
BENCHMARK(BM_Ours_AABB_AABB_Placed);
BENCHMARK(BM_FCL_AABB_AABB_Placed);
BENCHMARK(BM_Ours_OBB_OBB);
BENCHMARK(BM_Ours_OBB_Test);
BENCHMARK(BM_FCL_OBB_OBB);
BENCHMARK(BM_Ours_Sphere_Sphere);

BENCHMARK_MAIN();
