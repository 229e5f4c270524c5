// The per-address lock set against a mutex per object and a striped array of 64 mutexes, from one
// and two threads; the pool against malloc/free for 64-byte objects.
#include "RKMPolyPool.h"
#include "RKMPolySetOfMutex.h"

#include <benchmark/benchmark.h>

#include <array>
#include <cstdint>
#include <cstdlib>
#include <mutex>

namespace
{
constexpr int kObjects = 64;

struct Object
{
  std::mutex own;
  long counter = 0;
};

std::array<Object, kObjects> g_objects;
RKMPolySetOfMutex g_set;
std::array<std::mutex, 64> g_stripes;

std::mutex &Stripe(const void *p)
{
  const std::uintptr_t w = reinterpret_cast<std::uintptr_t>(p);
  return g_stripes[(w >> 6) % g_stripes.size()];
}

// state.range(0): 1 locks one object over and over, 64 rotates through all of them.
int Pick(benchmark::State &state, int i) { return state.range(0) == 1 ? 0 : i % kObjects; }

void BM_SetOfMutex(benchmark::State &state)
{
  int i = state.thread_index();
  for (auto _ : state)
  {
    Object &o = g_objects[static_cast<size_t>(Pick(state, i++))];
    g_set.Lock(&o);
    ++o.counter;
    g_set.Unlock(&o);
  }
  state.SetItemsProcessed(state.iterations());
}

void BM_MutexPerObject(benchmark::State &state)
{
  int i = state.thread_index();
  for (auto _ : state)
  {
    Object &o = g_objects[static_cast<size_t>(Pick(state, i++))];
    std::lock_guard<std::mutex> lock(o.own);
    ++o.counter;
  }
  state.SetItemsProcessed(state.iterations());
}

void BM_StripedMutex(benchmark::State &state)
{
  int i = state.thread_index();
  for (auto _ : state)
  {
    Object &o = g_objects[static_cast<size_t>(Pick(state, i++))];
    std::lock_guard<std::mutex> lock(Stripe(&o));
    ++o.counter;
  }
  state.SetItemsProcessed(state.iterations());
}

// Allocates a batch of 64 objects of 64 bytes and frees them, as a hierarchy build and teardown does.
void BM_PoolAllocate64(benchmark::State &state)
{
  void *blocks[64];
  for (auto _ : state)
  {
    for (void *&b : blocks)
      b = RKMPolyPool::AllocateObjectInDefaultPool(64);
    benchmark::DoNotOptimize(blocks);
    for (void *b : blocks)
      RKMPolyPool::FreeObjectFromPool(b);
  }
  state.SetItemsProcessed(state.iterations() * 64);
}

void BM_Malloc64(benchmark::State &state)
{
  void *blocks[64];
  for (auto _ : state)
  {
    for (void *&b : blocks)
      b = std::malloc(64);
    benchmark::DoNotOptimize(blocks);
    for (void *b : blocks)
      std::free(b);
  }
  state.SetItemsProcessed(state.iterations() * 64);
}
}

BENCHMARK(BM_SetOfMutex)->Arg(1)->Arg(64)->Threads(1)->Threads(2);
BENCHMARK(BM_MutexPerObject)->Arg(1)->Arg(64)->Threads(1)->Threads(2);
BENCHMARK(BM_StripedMutex)->Arg(1)->Arg(64)->Threads(1)->Threads(2);
BENCHMARK(BM_PoolAllocate64)->Threads(1)->Threads(2);
BENCHMARK(BM_Malloc64)->Threads(1)->Threads(2);

BENCHMARK_MAIN();
