// Exact orientation tests: ours in the Gridded mode (on snapped coordinates) and in the Adaptive mode,
// against Shewchuk's adaptive predicates and CGAL's filtered ones, on the same inputs in the same
// run. Prints ns per call and the peer-to-ours ratios at the end.

#include <benchmark/benchmark.h>

#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <map>
#include <random>
#include <string>
#include <vector>

#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactBenchPeers.h"

namespace
{
constexpr int kGroups = 4096;

struct DataSet
{
  std::vector<double> quads;   // 12 doubles per 3D case
  std::vector<double> triples; // 6 doubles per 2D case
  bool onGrid = true;
};

const RKMPolyExactArithmetic &Grid()
{
  static RKMPolyExactArithmetic a(RKMPolyExactArithmetic::Gridded);
  return a;
}

const RKMPolyExactArithmetic &AdaptiveArithmetic()
{
  static RKMPolyExactArithmetic a(RKMPolyExactArithmetic::Adaptive);
  return a;
}

double Snapped(double v)
{
  Grid().Normalize(v);
  return v;
}

// Random points of the default grid (maximum 100000).
DataSet MakeRandom()
{
  DataSet s;
  std::mt19937_64 rng(17);
  std::uniform_real_distribution<double> U(-1.0e5, 1.0e5);
  for (int i = 0; i < 12 * kGroups; ++i)
    s.quads.push_back(Snapped(U(rng)));
  for (int i = 0; i < 6 * kGroups; ++i)
    s.triples.push_back(Snapped(U(rng)));
  return s;
}

// Grid points where d is an integer combination of the triangle's edges (exactly coplanar or
// collinear), moved off by one grid step in half of the cases.
DataSet MakeDegenerateOnGrid()
{
  DataSet s;
  std::mt19937_64 rng(23);
  const double step = 2.0 * Grid().GetCoordinatePrecision();
  std::uniform_int_distribution<int> U(-(1 << 19), 1 << 19), small(-2, 2), coin(0, 1), axis(0, 2);
  for (int g = 0; g < kGroups; ++g)
  {
    double p[3][3];
    for (auto &pt : p)
      for (double &v : pt)
        v = U(rng) * step;
    const int i = small(rng), j = small(rng);
    double d[3];
    for (int k = 0; k < 3; ++k)
      d[k] = p[0][k] + i * (p[1][k] - p[0][k]) + j * (p[2][k] - p[0][k]);
    if (coin(rng))
      d[axis(rng)] += step;
    for (auto &pt : p)
      s.quads.insert(s.quads.end(), pt, pt + 3);
    s.quads.insert(s.quads.end(), d, d + 3);
    double c2[2] = {p[0][0] + i * (p[1][0] - p[0][0]), p[0][1] + i * (p[1][1] - p[0][1])};
    if (coin(rng))
      c2[axis(rng) % 2] += step;
    s.triples.insert(s.triples.end(), {p[0][0], p[0][1], p[1][0], p[1][1], c2[0], c2[1]});
  }
  return s;
}

// Arbitrary doubles where d is computed on the plane (or line) and rounded: nearly degenerate, so the
// adaptive stages run.
DataSet MakeDegenerateDoubles()
{
  DataSet s;
  s.onGrid = false;
  std::mt19937_64 rng(29);
  std::uniform_real_distribution<double> U(-1.0, 1.0), T(0.0, 1.0);
  for (int g = 0; g < kGroups; ++g)
  {
    double p[3][3];
    for (auto &pt : p)
      for (double &v : pt)
        v = U(rng);
    const double a = T(rng), b = T(rng);
    double d[3];
    for (int k = 0; k < 3; ++k)
      d[k] = p[0][k] + a * (p[1][k] - p[0][k]) + b * (p[2][k] - p[0][k]);
    for (auto &pt : p)
      s.quads.insert(s.quads.end(), pt, pt + 3);
    s.quads.insert(s.quads.end(), d, d + 3);
    s.triples.insert(s.triples.end(), {p[0][0], p[0][1], p[1][0], p[1][1], p[0][0] + a * (p[1][0] - p[0][0]),
                                       p[0][1] + a * (p[1][1] - p[0][1])});
  }
  return s;
}

const std::map<std::string, DataSet> &Sets()
{
  static const std::map<std::string, DataSet> sets = {
      {"Random", MakeRandom()}, {"DegenerateOnGrid", MakeDegenerateOnGrid()}, {"DegenerateDoubles", MakeDegenerateDoubles()}};
  return sets;
}

int Sign(double v)
{
  return v > 0.0 ? 1 : (v < 0.0 ? -1 : 0);
}

// Every method must give the same signs before any is timed.
bool CheckAgreement()
{
  bool ok = true;
  for (const auto &[name, s] : Sets())
  {
    std::vector<double> q = s.quads, t = s.triples;
    for (int i = 0; i < kGroups; ++i)
    {
      double *p = q.data() + 12 * i;
      const int ref = -Sign(orient3d(p, p + 3, p + 6, p + 9));
      const int cgal = CgalOrientation3(p, p + 3, p + 6, p + 9);
      const int ada = AdaptiveArithmetic().Orientation3D(p, p + 3, p + 6, p + 9);
      const int grid = s.onGrid ? Grid().Orientation3D(p, p + 3, p + 6, p + 9) : ref;
      if (cgal != ref || ada != ref || grid != ref)
      {
        std::fprintf(stderr, "%s: 3D case %d disagrees: Shewchuk %d, CGAL %d, adaptive %d, gridded %d\n", name.c_str(),
                     i, ref, cgal, ada, grid);
        ok = false;
      }
      double *r = t.data() + 6 * i;
      const int ref2 = Sign(orient2d(r, r + 2, r + 4));
      const int ada2 = AdaptiveArithmetic().Orientation2D(r, r + 2, r + 4);
      const int grid2 = s.onGrid ? Grid().Orientation2D(r, r + 2, r + 4) : ref2;
      if (ada2 != ref2 || grid2 != ref2)
      {
        std::fprintf(stderr, "%s: 2D case %d disagrees\n", name.c_str(), i);
        ok = false;
      }
    }
  }
  return ok;
}

enum Method
{
  OursGridded,
  OursAdaptive,
  Shewchuk,
  Cgal
};

template <Method M> void Orientation3D(benchmark::State &state, const std::string &set)
{
  std::vector<double> q = Sets().at(set).quads;
  const RKMPolyExactArithmetic &ar = M == OursGridded ? Grid() : AdaptiveArithmetic();
  for (auto _ : state)
  {
    long sum = 0;
    if constexpr (M == Cgal)
      sum = CgalOrientation3Sum(q.data(), kGroups);
    else
      for (int i = 0; i < kGroups; ++i)
      {
        double *p = q.data() + 12 * i;
        if constexpr (M == Shewchuk)
          sum += Sign(orient3d(p, p + 3, p + 6, p + 9));
        else
          sum += ar.Orientation3D(p, p + 3, p + 6, p + 9);
      }
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(state.iterations() * kGroups);
}

template <Method M> void Orientation2D(benchmark::State &state, const std::string &set)
{
  std::vector<double> t = Sets().at(set).triples;
  const RKMPolyExactArithmetic &ar = M == OursGridded ? Grid() : AdaptiveArithmetic();
  for (auto _ : state)
  {
    long sum = 0;
    if constexpr (M == Cgal)
      sum = CgalOrientation2Sum(t.data(), kGroups);
    else
      for (int i = 0; i < kGroups; ++i)
      {
        double *p = t.data() + 6 * i;
        if constexpr (M == Shewchuk)
          sum += Sign(orient2d(p, p + 2, p + 4));
        else
          sum += ar.Orientation2D(p, p + 2, p + 4);
      }
    benchmark::DoNotOptimize(sum);
  }
  state.SetItemsProcessed(state.iterations() * kGroups);
}

const char *const kMethodNames[] = {"OursGridded", "OursAdaptive", "Shewchuk", "CGAL"};

template <Method M> void RegisterMethod(const std::string &set, bool onGrid)
{
  if (M == OursGridded && !onGrid)
    return;
  benchmark::RegisterBenchmark(("Orientation3D/" + set + "/" + kMethodNames[M]).c_str(),
                               [set](benchmark::State &st) { Orientation3D<M>(st, set); });
  benchmark::RegisterBenchmark(("Orientation2D/" + set + "/" + kMethodNames[M]).c_str(),
                               [set](benchmark::State &st) { Orientation2D<M>(st, set); });
}

// Collects ns per call and prints, per test and input, each peer's time over ours.
class RatioReporter : public benchmark::ConsoleReporter
{
public:
  void ReportRuns(const std::vector<Run> &runs) override
  {
    ConsoleReporter::ReportRuns(runs);
    for (const Run &r : runs)
      if (r.run_type == Run::RT_Iteration)
        m_ns[r.benchmark_name()] = r.GetAdjustedRealTime() / kGroups;
  }
  void Finalize() override
  {
    ConsoleReporter::Finalize();
    std::printf("\nns per call, and peer time / our time (above 1: ours faster)\n");
    for (const char *test : {"Orientation3D", "Orientation2D"})
      for (const auto &[set, data] : Sets())
      {
        const std::string base = std::string(test) + "/" + set + "/";
        auto ns = [&](const char *m) {
          auto it = m_ns.find(base + m);
          return it == m_ns.end() ? std::nan("") : it->second;
        };
        std::printf("%-14s %-18s", test, set.c_str());
        for (const char *m : kMethodNames)
          std::printf("  %s %.2f", m, ns(m));
        for (const char *ours : {"OursGridded", "OursAdaptive"})
          if (!std::isnan(ns(ours)))
            std::printf("  | %s: Shewchuk/ours %.2f, CGAL/ours %.2f", ours, ns("Shewchuk") / ns(ours),
                        ns("CGAL") / ns(ours));
        std::printf("\n");
      }
  }

private:
  std::map<std::string, double> m_ns;
};
} // namespace

int main(int argc, char **argv)
{
  // Turn Shewchuk's unchecked static filter off, so that its answers are exact.
  exactinit(0, 0, 1, 1.0, 1.0, 1.0);
  if (!CheckAgreement())
    return 1;
  for (const auto &[set, data] : Sets())
  {
    RegisterMethod<OursGridded>(set, data.onGrid);
    RegisterMethod<OursAdaptive>(set, data.onGrid);
    RegisterMethod<Shewchuk>(set, data.onGrid);
    RegisterMethod<Cgal>(set, data.onGrid);
  }
  benchmark::Initialize(&argc, argv);
  RatioReporter reporter;
  benchmark::RunSpecifiedBenchmarks(&reporter);
  benchmark::Shutdown();
  return 0;
}
