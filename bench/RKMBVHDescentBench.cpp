// The pair descent's own cost: two hierarchies of 100,000 small boxes each, walked with a Filter that
// is one box overlap test and a ProcessLeafNodes that only counts. Reported in filtered pairs per
// second; the clash queries spend their time in this loop.
#include "RKMBVHDescentOperator.h"
#include "RKMBVHNode.h"
#include "RKMBVHTree.h"
#include "RKMMathBox.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"

#include <benchmark/benchmark.h>

#include <algorithm>
#include <random>
#include <vector>

namespace
{
struct Leaf
{
  RKMMathBox box;
  double centre[3];
};

// Median split on the longest axis of the centres; parents grow over their children by AbsorbChild.
RKMBVHNode *Build(std::vector<Leaf> &leaves, size_t lo, size_t hi)
{
  if (hi - lo == 1)
    return new RKMBVHNode(new RKMPolyAABB(leaves[lo].box));
  double mn[3] = {1e300, 1e300, 1e300}, mx[3] = {-1e300, -1e300, -1e300};
  for (size_t i = lo; i < hi; ++i)
    for (int a = 0; a < 3; ++a)
    {
      mn[a] = std::min(mn[a], leaves[i].centre[a]);
      mx[a] = std::max(mx[a], leaves[i].centre[a]);
    }
  int axis = 0;
  for (int a = 1; a < 3; ++a)
    if (mx[a] - mn[a] > mx[axis] - mn[axis])
      axis = a;
  const size_t mid = (lo + hi) / 2;
  std::nth_element(leaves.begin() + static_cast<long>(lo), leaves.begin() + static_cast<long>(mid),
                   leaves.begin() + static_cast<long>(hi),
                   [axis](const Leaf &p, const Leaf &q) { return p.centre[axis] < q.centre[axis]; });
  RKMBVHNode *node = new RKMBVHNode(new RKMPolyAABB());
  node->AbsorbChild(Build(leaves, lo, mid));
  node->AbsorbChild(Build(leaves, mid, hi));
  return node;
}

RKMBVHTree *MakeTree(unsigned seed, double shift)
{
  std::mt19937_64 rng(seed);
  std::uniform_real_distribution<double> pos(0.0, 100.0), size(0.05, 0.4);
  std::vector<Leaf> leaves(100000);
  for (Leaf &l : leaves)
  {
    const double c[3] = {pos(rng) + shift, pos(rng), pos(rng)};
    const double h = size(rng);
    l.box = RKMMathBox(c[0] - h, c[0] + h, c[1] - h, c[1] + h, c[2] - h, c[2] + h);
    std::copy(c, c + 3, l.centre);
  }
  return new RKMBVHTree(Build(leaves, 0, leaves.size()));
}

class CountingWalk : public RKMBVHDescentOperator
{
public:
  long filtered = 0, leafPairs = 0;

protected:
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    ++filtered;
    return RKMPolyBVBVOperations::BVOverLap(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(), 0.0, nullptr,
                                            nullptr);
  }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &, RKMBVHNodeConst &) override
  {
    ++leafPairs;
    return S_OK;
  }
};

void BM_PairDescent(benchmark::State &state)
{
  RKMBVHTree *a = MakeTree(1, 0.0), *b = MakeTree(2, 30.0);
  long filtered = 0, leafPairs = 0;
  for (auto _ : state)
  {
    CountingWalk walk;
    walk.Descend(*a, *b);
    filtered += walk.filtered;
    leafPairs = walk.leafPairs;
  }
  state.counters["pairs_per_second"] = benchmark::Counter(static_cast<double>(filtered), benchmark::Counter::kIsRate);
  state.counters["leaf_pairs"] = static_cast<double>(leafPairs);
  a->Release();
  b->Release();
}
}

BENCHMARK(BM_PairDescent)->Unit(benchmark::kMillisecond);

BENCHMARK_MAIN();
