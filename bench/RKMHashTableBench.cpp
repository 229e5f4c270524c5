// The int-keyed map and set against std::unordered_map/set, absl::flat_hash_map/set and
// tsl::robin_map/set, on the same keys in the same run. Sizes span the inline storage (8, 31) to a
// million; "Many" builds 10,000 maps of 8 keys each, the library's typical use.
#include "RKMMapOfIntToInt.h"
#include "RKMSetOfInt.h"

#include <absl/container/flat_hash_map.h>
#include <absl/container/flat_hash_set.h>
#include <benchmark/benchmark.h>
#include <tsl/robin_map.h>
#include <tsl/robin_set.h>

#include <algorithm>
#include <random>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace
{
struct Keys
{
  std::vector<int> hits, misses;
};

// Distinct random keys; the misses are drawn from the same range and are in no map.
const Keys &KeysOf(int n)
{
  static std::unordered_map<int, Keys> cache;
  Keys &k = cache[n];
  if (k.hits.empty())
  {
    std::mt19937 rng(static_cast<unsigned>(n) * 2654435761u);
    std::unordered_set<int> seen;
    std::uniform_int_distribution<int> d(-(1 << 30), 1 << 30);
    while (static_cast<int>(k.hits.size()) < n)
    {
      int v = d(rng);
      if (seen.insert(v).second)
        k.hits.push_back(v);
    }
    while (static_cast<int>(k.misses.size()) < n)
    {
      int v = d(rng);
      if (seen.insert(v).second)
        k.misses.push_back(v);
    }
  }
  return k;
}

struct OursMap
{
  RKMMapOfIntToInt m;
  void Insert(int k) { m.Insert(k, k); }
  bool Find(int k) const
  {
    int v;
    return m.Locate(k, v);
  }
  void Erase(int k) { m.Remove(k); }
  long Sum() const
  {
    long s = 0;
    for (RKMMapOfIntToInt::Iterator it(m); !it.End(); ++it)
      s += it.GetData();
    return s;
  }
};

struct OursSet
{
  RKMSetOfInt m;
  void Insert(int k) { m.Insert(k); }
  bool Find(int k) const { return m.Locate(k); }
  void Erase(int k) { m.Remove(k); }
  long Sum() const
  {
    long s = 0;
    for (RKMSetOfInt::Iterator it(m); !it.End(); ++it)
      s += *it;
    return s;
  }
};

template <class M>
struct StdLikeMap
{
  M m;
  void Insert(int k) { m.emplace(k, k); }
  bool Find(int k) const { return m.find(k) != m.end(); }
  void Erase(int k) { m.erase(k); }
  long Sum() const
  {
    long s = 0;
    for (const auto &kv : m)
      s += kv.second;
    return s;
  }
};

template <class S>
struct StdLikeSet
{
  S m;
  void Insert(int k) { m.insert(k); }
  bool Find(int k) const { return m.find(k) != m.end(); }
  void Erase(int k) { m.erase(k); }
  long Sum() const
  {
    long s = 0;
    for (int k : m)
      s += k;
    return s;
  }
};

using StdMap = StdLikeMap<std::unordered_map<int, int>>;
using AbslMap = StdLikeMap<absl::flat_hash_map<int, int>>;
using RobinMap = StdLikeMap<tsl::robin_map<int, int>>;
using StdSet = StdLikeSet<std::unordered_set<int>>;
using AbslSet = StdLikeSet<absl::flat_hash_set<int>>;
using RobinSet = StdLikeSet<tsl::robin_set<int>>;

template <class M>
void BM_Insert(benchmark::State &state)
{
  const Keys &k = KeysOf(static_cast<int>(state.range(0)));
  for (auto _ : state)
  {
    M m;
    for (int key : k.hits)
      m.Insert(key);
    benchmark::DoNotOptimize(m);
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

template <class M>
void BM_FindHit(benchmark::State &state)
{
  const Keys &k = KeysOf(static_cast<int>(state.range(0)));
  M m;
  for (int key : k.hits)
    m.Insert(key);
  for (auto _ : state)
  {
    long found = 0;
    for (int key : k.hits)
      found += m.Find(key);
    benchmark::DoNotOptimize(found);
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

template <class M>
void BM_FindMiss(benchmark::State &state)
{
  const Keys &k = KeysOf(static_cast<int>(state.range(0)));
  M m;
  for (int key : k.hits)
    m.Insert(key);
  for (auto _ : state)
  {
    long found = 0;
    for (int key : k.misses)
      found += m.Find(key);
    benchmark::DoNotOptimize(found);
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

// Fills outside the timer, then removes every key in insertion order.
template <class M>
void BM_Remove(benchmark::State &state)
{
  const Keys &k = KeysOf(static_cast<int>(state.range(0)));
  for (auto _ : state)
  {
    state.PauseTiming();
    M *m = new M;
    for (int key : k.hits)
      m->Insert(key);
    state.ResumeTiming();
    for (int key : k.hits)
      m->Erase(key);
    benchmark::DoNotOptimize(*m);
    state.PauseTiming();
    delete m;
    state.ResumeTiming();
  }
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

template <class M>
void BM_Iterate(benchmark::State &state)
{
  const Keys &k = KeysOf(static_cast<int>(state.range(0)));
  M m;
  for (int key : k.hits)
    m.Insert(key);
  for (auto _ : state)
    benchmark::DoNotOptimize(m.Sum());
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

// 10,000 maps of 8 keys: build them all, look every key up once, destroy them.
template <class M>
void BM_Many(benchmark::State &state)
{
  const Keys &k = KeysOf(8 * 10000);
  for (auto _ : state)
  {
    std::vector<M> maps(10000);
    for (int i = 0; i < 10000; ++i)
      for (int j = 0; j < 8; ++j)
        maps[static_cast<size_t>(i)].Insert(k.hits[static_cast<size_t>(8 * i + j)]);
    long found = 0;
    for (int i = 0; i < 10000; ++i)
      for (int j = 0; j < 8; ++j)
        found += maps[static_cast<size_t>(i)].Find(k.hits[static_cast<size_t>(8 * i + j)]);
    benchmark::DoNotOptimize(found);
  }
  state.SetItemsProcessed(state.iterations() * 80000);
}

void Sizes(benchmark::internal::Benchmark *b)
{
  for (int n : {8, 31, 1000, 100000, 1000000})
    b->Arg(n);
}
}

#define RKM_HASH_BENCH(M)                                                                                              \
  BENCHMARK_TEMPLATE(BM_Insert, M)->Apply(Sizes);                                                                      \
  BENCHMARK_TEMPLATE(BM_FindHit, M)->Apply(Sizes);                                                                     \
  BENCHMARK_TEMPLATE(BM_FindMiss, M)->Apply(Sizes);                                                                    \
  BENCHMARK_TEMPLATE(BM_Remove, M)->Apply(Sizes);                                                                      \
  BENCHMARK_TEMPLATE(BM_Iterate, M)->Apply(Sizes);                                                                     \
  BENCHMARK_TEMPLATE(BM_Many, M)

RKM_HASH_BENCH(OursMap);
RKM_HASH_BENCH(StdMap);
RKM_HASH_BENCH(AbslMap);
RKM_HASH_BENCH(RobinMap);
RKM_HASH_BENCH(OursSet);
RKM_HASH_BENCH(StdSet);
RKM_HASH_BENCH(AbslSet);
RKM_HASH_BENCH(RobinSet);

BENCHMARK_MAIN();
