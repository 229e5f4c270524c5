// Overlap tests of the float box against the same test on double-precision boxes, over a fixed set of
// random boxes in which about a third of the pairs overlap (a typical hierarchy walk mix).
#include "RKMMathBox.h"
#include "RKMMathPoint.h"
#include "RKMPolyBoxf.h"

#include <benchmark/benchmark.h>

#include <random>
#include <vector>

namespace
{
constexpr int kBoxes = 4096;

struct DoubleBox
{
  double lo[3], hi[3];
  bool Overlaps(const DoubleBox &o) const
  {
    return !(o.hi[0] < lo[0] || hi[0] < o.lo[0] || o.hi[1] < lo[1] || hi[1] < o.lo[1] || o.hi[2] < lo[2] ||
             hi[2] < o.lo[2]);
  }
};

struct Scene
{
  std::vector<RKMPolyBoxf> floatBoxes;
  std::vector<RKMPolyBoxf::IntersectionTestOrder> orders;
  std::vector<RKMMathBox> mathBoxes;
  std::vector<DoubleBox> doubleBoxes;

  Scene()
  {
    std::mt19937_64 rng(20261206);
    std::uniform_real_distribution<double> centre(0.0, 10.0), size(0.1, 3.0);
    for (int i = 0; i < kBoxes; ++i)
    {
      double c[3], h[3];
      for (int a = 0; a < 3; ++a)
      {
        c[a] = centre(rng);
        h[a] = size(rng);
      }
      RKMMathBox mb(c[0] - h[0], c[0] + h[0], c[1] - h[1], c[1] + h[1], c[2] - h[2], c[2] + h[2]);
      mathBoxes.push_back(mb);
      floatBoxes.emplace_back(mb);
      orders.push_back(floatBoxes.back().GetAxisTestOrder());
      doubleBoxes.push_back({{c[0] - h[0], c[1] - h[1], c[2] - h[2]}, {c[0] + h[0], c[1] + h[1], c[2] + h[2]}});
    }
  }
};

const Scene &TheScene()
{
  static const Scene scene;
  return scene;
}

// Each iteration tests box i against the next 64 boxes, so the loads stay in cache as in a descent.
template <class Test>
void Run(benchmark::State &state, Test test)
{
  const Scene &s = TheScene();
  int i = 0;
  long hits = 0;
  for (auto _ : state)
  {
    for (int k = 1; k <= 64; ++k)
      hits += test(s, i, (i + k) % kBoxes);
    i = (i + 1) % kBoxes;
  }
  benchmark::DoNotOptimize(hits);
  state.SetItemsProcessed(state.iterations() * 64);
}

void BM_Boxf_IsIntersecting(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.floatBoxes[a].IsIntersecting(s.floatBoxes[b], 0.0f); });
}
void BM_Boxf_FastIsIntersecting(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.floatBoxes[a].FastIsIntersecting(s.floatBoxes[b]); });
}
void BM_Boxf_UltraFastIsIntersecting(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) {
    return s.floatBoxes[a].UltraFastIsIntersecting(s.orders[a], s.floatBoxes[b]);
  });
}
void BM_MathBox_IsIntersecting(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.mathBoxes[a].IsIntersecting(s.mathBoxes[b], 0.0); });
}
void BM_DoubleBox_Inline(benchmark::State &state)
{
  Run(state, [](const Scene &s, int a, int b) { return s.doubleBoxes[a].Overlaps(s.doubleBoxes[b]); });
}
void BM_Boxf_AddInsidePoint(benchmark::State &state)
{
  std::mt19937_64 rng(7);
  std::uniform_real_distribution<double> u(-1e3, 1e3);
  std::vector<RKMMathPoint> points(4096);
  for (RKMMathPoint &p : points)
    p = RKMMathPoint(u(rng), u(rng), u(rng));
  for (auto _ : state)
  {
    RKMPolyBoxf box;
    for (const RKMMathPoint &p : points)
      box.AddInside(p);
    benchmark::DoNotOptimize(box);
  }
  state.SetItemsProcessed(state.iterations() * static_cast<long>(points.size()));
}
}

BENCHMARK(BM_Boxf_IsIntersecting);
BENCHMARK(BM_Boxf_FastIsIntersecting);
BENCHMARK(BM_Boxf_UltraFastIsIntersecting);
BENCHMARK(BM_MathBox_IsIntersecting);
BENCHMARK(BM_DoubleBox_Inline);
BENCHMARK(BM_Boxf_AddInsidePoint);

BENCHMARK_MAIN();
