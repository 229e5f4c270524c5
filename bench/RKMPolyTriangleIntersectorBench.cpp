// Triangle–triangle tests per second: ours (which also classifies the contact features) in the
// Gridded mode on snapped coordinates and in the Adaptive mode, against CGAL's exact yes/no test,
// on the same pairs in the same run. Prints ns per pair and the ratios at the end.

#include <benchmark/benchmark.h>

#include <cmath>
#include <functional>
#include <cstdio>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "RKMMathPoint.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyTriangleIntersector.h"
#include "RKMPolyTriangleIntersectorBenchPeers.h"

namespace
{
constexpr int kPairs = 4096;

// The grid fitted to the data, as RKMPolyNormalizeUtils would set it: every coordinate below 128.
const RKMPolyExactArithmetic &Grid()
{
  static const RKMPolyExactArithmetic &a = [] {
    static RKMPolyExactArithmetic g(RKMPolyExactArithmetic::Gridded);
    g.SetMaxCoord(128.0f);
    return std::ref(g);
  }();
  return a;
}

const RKMPolyExactArithmetic &AdaptiveArithmetic()
{
  static RKMPolyExactArithmetic a(RKMPolyExactArithmetic::Adaptive);
  return a;
}

double Snap(double v)
{
  Grid().Normalize(v);
  return v;
}

// Pairs of triangles of edge about 10 in a box of 100 (mostly apart), pairs built to cross through
// each other, and coplanar pairs that overlap. Coordinates are on the default grid, so both modes
// and CGAL see the same numbers.
std::vector<double> MakePairs(const std::string &kind)
{
  std::mt19937_64 rng(kind == "Disjoint" ? 41 : (kind == "Crossing" ? 43 : 47));
  std::uniform_real_distribution<double> box(-50.0, 50.0), edge(-10.0, 10.0), small(-1.0, 1.0);
  std::vector<double> out;
  out.reserve(18 * kPairs);
  for (int i = 0; i < kPairs; ++i)
  {
    double t[6][3];
    const double c[3] = {box(rng), box(rng), box(rng)};
    for (auto &v : t)
      for (int k = 0; k < 3; ++k)
        v[k] = c[k] + edge(rng);
    if (kind == "Disjoint")
      for (int v = 3; v < 6; ++v)
        for (int k = 0; k < 3; ++k)
          t[v][k] += box(rng);
    else if (kind == "Crossing")
    {
      // The second triangle straddles the first's plane through its centroid.
      for (int k = 0; k < 3; ++k)
      {
        const double g = (t[0][k] + t[1][k] + t[2][k]) / 3.0;
        t[3][k] = g + small(rng) * 8.0;
        t[4][k] = g + small(rng) * 8.0;
        t[5][k] = g + small(rng) * 8.0;
      }
    }
    else
      for (int v = 0; v < 6; ++v)
        t[v][2] = c[2];
    for (auto &v : t)
      for (double x : v)
        out.push_back(Snap(x));
  }
  return out;
}

const std::map<std::string, std::vector<double>> &Sets()
{
  static const std::map<std::string, std::vector<double>> sets = {
      {"Disjoint", MakePairs("Disjoint")}, {"Crossing", MakePairs("Crossing")}, {"Coplanar", MakePairs("Coplanar")}};
  return sets;
}

long OursSum(const RKMPolyExactArithmetic &arithmetic, const std::vector<double> &pairs)
{
  RKMPolyTriangleIntersector tri(arithmetic);
  long s = 0;
  for (int i = 0; i < kPairs; ++i)
  {
    const double *q = pairs.data() + 18 * i;
    const RKMMathPoint t1[3] = {{q[0], q[1], q[2]}, {q[3], q[4], q[5]}, {q[6], q[7], q[8]}};
    const RKMMathPoint t2[3] = {{q[9], q[10], q[11]}, {q[12], q[13], q[14]}, {q[15], q[16], q[17]}};
    s += tri.Intersect(t1, t2) > 0 ? 1 : 0;
  }
  return s;
}

const char *const kMethods[] = {"OursGridded", "OursAdaptive", "CGAL"};

void Run(benchmark::State &state, const std::string &set, int method)
{
  const std::vector<double> &pairs = Sets().at(set);
  for (auto _ : state)
  {
    long s = method == 2 ? CgalTriangleTriangleSum(pairs.data(), kPairs)
                         : OursSum(method == 0 ? Grid() : AdaptiveArithmetic(), pairs);
    benchmark::DoNotOptimize(s);
  }
  state.SetItemsProcessed(state.iterations() * kPairs);
}

class RatioReporter : public benchmark::ConsoleReporter
{
public:
  void ReportRuns(const std::vector<Run> &runs) override
  {
    ConsoleReporter::ReportRuns(runs);
    for (const Run &r : runs)
      if (r.run_type == Run::RT_Iteration)
        m_ns[r.benchmark_name()] = r.GetAdjustedRealTime() / kPairs;
  }
  void Finalize() override
  {
    ConsoleReporter::Finalize();
    std::printf("\nns per pair, and CGAL time / our time (above 1: ours faster)\n");
    for (const auto &[set, pairs] : Sets())
    {
      auto ns = [&](const char *m) {
        auto it = m_ns.find("TriangleTriangle/" + set + "/" + m);
        return it == m_ns.end() ? std::nan("") : it->second;
      };
      std::printf("%-9s gridded %.1f  adaptive %.1f  CGAL %.1f  | CGAL/gridded %.2f  CGAL/adaptive %.2f\n",
                  set.c_str(), ns("OursGridded"), ns("OursAdaptive"), ns("CGAL"), ns("CGAL") / ns("OursGridded"),
                  ns("CGAL") / ns("OursAdaptive"));
    }
  }

private:
  std::map<std::string, double> m_ns;
};
} // namespace

int main(int argc, char **argv)
{
  // Both must find the same pairs intersecting before anything is timed.
  for (const auto &[set, pairs] : Sets())
  {
    const long cgal = CgalTriangleTriangleSum(pairs.data(), kPairs);
    const long grid = OursSum(Grid(), pairs), ada = OursSum(AdaptiveArithmetic(), pairs);
    std::printf("%s: %ld of %d pairs meet (CGAL %ld, gridded %ld, adaptive %ld)\n", set.c_str(), cgal, kPairs, cgal,
                grid, ada);
    if (cgal != grid || cgal != ada)
    {
      std::fprintf(stderr, "%s: the answers differ\n", set.c_str());
      return 1;
    }
    for (int m = 0; m < 3; ++m)
      benchmark::RegisterBenchmark(("TriangleTriangle/" + set + "/" + kMethods[m]).c_str(),
                                   [set = set, m](benchmark::State &st) { Run(st, set, m); });
  }
  benchmark::Initialize(&argc, argv);
  RatioReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  benchmark::Shutdown();
  return 0;
}
