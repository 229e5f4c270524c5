// Build time and quality of the hierarchy builders over random boxes, with Embree's BVH builder on the
// same boxes in the same run where it is installed. Quality is the surface-area cost: the sum over inner
// nodes of node area over root area (lower is better).
#include "RKMBVHNode.h"
#include "RKMBVHNodeIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeBuilder.h"
#include "RKMMathBox.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVOperations.h"

#include <benchmark/benchmark.h>

#include <random>
#include <vector>

#ifdef RKM_BENCH_WITH_EMBREE
#include <embree3/rtcore.h>
#endif

#ifdef RKM_BENCH_WITH_CGAL
double RKMBenchBuildCGALTree(const std::vector<double> &corners);
#endif

namespace
{
std::vector<RKMMathBox> Boxes(size_t n)
{
  std::mt19937_64 rng(20261206);
  std::uniform_real_distribution<double> pos(0.0, 100.0), size(0.05, 0.5);
  std::vector<RKMMathBox> boxes;
  boxes.reserve(n);
  for (size_t i = 0; i < n; ++i)
  {
    const double x = pos(rng), y = pos(rng), z = pos(rng), h = size(rng);
    boxes.emplace_back(x - h, x + h, y - h, y + h, z - h, z + h);
  }
  return boxes;
}

class Leaves : public RKMBVHNodeIterator
{
public:
  explicit Leaves(const std::vector<RKMBVHNode *> &nodes) : m_nodes(nodes) {}
  RKMBVHNodeIterator &Begin() override
  {
    m_i = 0;
    return *this;
  }
  unsigned char End() const override { return m_i >= m_nodes.size(); }
  RKMBVHNodeIterator &operator++() override
  {
    ++m_i;
    return *this;
  }
  RKMBVHNode *operator*() const override { return m_i < m_nodes.size() ? m_nodes[m_i] : nullptr; }

private:
  const std::vector<RKMBVHNode *> &m_nodes;
  size_t m_i = 0;
};

double Area(const RKMMathBox &b)
{
  double l[6];
  if (FAILED(b.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5])))
    return 0.0;
  const double x = l[1] - l[0], y = l[3] - l[2], z = l[5] - l[4];
  return 2.0 * (x * y + y * z + z * x);
}

double SurfaceAreaCost(const RKMBVHNodeConst *root)
{
  RKMMathBox rootBox;
  RKMPolyBVOperations::GetEnclosingBox(*root->GetFirstBoundingVolume(), rootBox);
  double sum = 0.0;
  std::vector<const RKMBVHNodeConst *> stack{root};
  while (!stack.empty())
  {
    const RKMBVHNodeConst *n = stack.back();
    stack.pop_back();
    if (n->GetChildren().Size() == 0)
      continue;
    RKMMathBox box;
    RKMPolyBVOperations::GetEnclosingBox(*n->GetFirstBoundingVolume(), box);
    sum += Area(box);
    for (int i = 1; i <= n->GetChildren().Size(); ++i)
      stack.push_back(n->GetChildren()[i]);
  }
  return sum / Area(rootBox);
}

void BuildOurs(benchmark::State &state, RKMBVHTreeBuilder::SpatialOptimization strategy)
{
  const std::vector<RKMMathBox> boxes = Boxes(static_cast<size_t>(state.range(0)));
  double cost = 0.0;
  for (auto _ : state)
  {
    state.PauseTiming();
    std::vector<RKMBVHNode *> nodes;
    nodes.reserve(boxes.size());
    for (const RKMMathBox &b : boxes)
      nodes.push_back(new RKMBVHNode(new RKMPolyAABB(b)));
    Leaves leaves(nodes);
    state.ResumeTiming();
    RKMBVHTree *tree = nullptr;
    RKMBVHTreeBuilder(strategy).Run(leaves, tree);
    state.PauseTiming();
    cost = SurfaceAreaCost(tree->GetRoot());
    tree->Release();
    state.ResumeTiming();
  }
  state.counters["sah"] = cost;
  state.SetItemsProcessed(state.iterations() * state.range(0));
}

void BM_Ours_Basic(benchmark::State &state) { BuildOurs(state, RKMBVHTreeBuilder::Basic); }
void BM_Ours_Best(benchmark::State &state) { BuildOurs(state, RKMBVHTreeBuilder::Best); }

#ifdef RKM_BENCH_WITH_EMBREE
struct EmbreeNode
{
  bool leaf;
  float lo[3], hi[3];
  EmbreeNode *child[2];
};

void *CreateInner(RTCThreadLocalAllocator alloc, unsigned int, void *)
{
  void *p = rtcThreadLocalAlloc(alloc, sizeof(EmbreeNode), 16);
  EmbreeNode *n = new (p) EmbreeNode{false, {0, 0, 0}, {0, 0, 0}, {nullptr, nullptr}};
  return n;
}
void SetChildren(void *node, void **children, unsigned int count, void *)
{
  EmbreeNode *n = static_cast<EmbreeNode *>(node);
  for (unsigned i = 0; i < count && i < 2; ++i)
    n->child[i] = static_cast<EmbreeNode *>(children[i]);
}
void SetBounds(void *node, const RTCBounds **bounds, unsigned int count, void *)
{
  EmbreeNode *n = static_cast<EmbreeNode *>(node);
  for (int a = 0; a < 3; ++a)
  {
    n->lo[a] = 1e30f;
    n->hi[a] = -1e30f;
  }
  for (unsigned i = 0; i < count; ++i)
  {
    const float lo[3] = {bounds[i]->lower_x, bounds[i]->lower_y, bounds[i]->lower_z};
    const float hi[3] = {bounds[i]->upper_x, bounds[i]->upper_y, bounds[i]->upper_z};
    for (int a = 0; a < 3; ++a)
    {
      n->lo[a] = std::min(n->lo[a], lo[a]);
      n->hi[a] = std::max(n->hi[a], hi[a]);
    }
  }
}
void *CreateLeaf(RTCThreadLocalAllocator alloc, const RTCBuildPrimitive *, size_t, void *)
{
  void *p = rtcThreadLocalAlloc(alloc, sizeof(EmbreeNode), 16);
  return new (p) EmbreeNode{true, {0, 0, 0}, {0, 0, 0}, {nullptr, nullptr}};
}

double EmbreeArea(const EmbreeNode *n)
{
  const double x = n->hi[0] - n->lo[0], y = n->hi[1] - n->lo[1], z = n->hi[2] - n->lo[2];
  return 2.0 * (x * y + y * z + z * x);
}

double EmbreeCost(const EmbreeNode *root)
{
  double sum = 0.0;
  std::vector<const EmbreeNode *> stack{root};
  while (!stack.empty())
  {
    const EmbreeNode *n = stack.back();
    stack.pop_back();
    if (!n || n->leaf)
      continue;
    sum += EmbreeArea(n);
    stack.push_back(n->child[0]);
    stack.push_back(n->child[1]);
  }
  return sum / EmbreeArea(root);
}

void BM_Embree_Build(benchmark::State &state)
{
  const std::vector<RKMMathBox> boxes = Boxes(static_cast<size_t>(state.range(0)));
  std::vector<RTCBuildPrimitive> source(boxes.size());
  for (size_t i = 0; i < boxes.size(); ++i)
  {
    double l[6];
    boxes[i].GetLimits(l[0], l[1], l[2], l[3], l[4], l[5]);
    source[i] = RTCBuildPrimitive{static_cast<float>(l[0]), static_cast<float>(l[2]), static_cast<float>(l[4]),
                                  static_cast<unsigned>(0), static_cast<float>(l[1]), static_cast<float>(l[3]),
                                  static_cast<float>(l[5]), static_cast<unsigned>(i)};
  }
  RTCDevice device = rtcNewDevice("threads=1");
  double cost = 0.0;
  for (auto _ : state)
  {
    state.PauseTiming();
    std::vector<RTCBuildPrimitive> prims = source;
    prims.reserve(prims.size() * 2);
    RTCBVH bvh = rtcNewBVH(device);
    RTCBuildArguments args = rtcDefaultBuildArguments();
    args.byteSize = sizeof(args);
    args.buildQuality = RTC_BUILD_QUALITY_MEDIUM;
    args.maxBranchingFactor = 2;
    args.maxDepth = 1024;
    args.sahBlockSize = 1;
    args.minLeafSize = 1;
    args.maxLeafSize = 1;
    args.traversalCost = 1.0f;
    args.intersectionCost = 1.0f;
    args.bvh = bvh;
    args.primitives = prims.data();
    args.primitiveCount = prims.size();
    args.primitiveArrayCapacity = prims.capacity();
    args.createNode = CreateInner;
    args.setNodeChildren = SetChildren;
    args.setNodeBounds = SetBounds;
    args.createLeaf = CreateLeaf;
    state.ResumeTiming();
    void *root = rtcBuildBVH(&args);
    state.PauseTiming();
    cost = EmbreeCost(static_cast<EmbreeNode *>(root));
    rtcReleaseBVH(bvh);
    state.ResumeTiming();
  }
  rtcReleaseDevice(device);
  state.counters["sah"] = cost;
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
#endif
}

#ifdef RKM_BENCH_WITH_CGAL
namespace
{
// One triangle per box, spanning three of its corners: CGAL's tree then bounds the same boxes.
void BM_CGAL_AABBTree(benchmark::State &state)
{
  const std::vector<RKMMathBox> boxes = Boxes(static_cast<size_t>(state.range(0)));
  std::vector<double> corners;
  corners.reserve(boxes.size() * 9);
  for (const RKMMathBox &b : boxes)
  {
    double l[6];
    b.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5]);
    const double t[9] = {l[0], l[2], l[4], l[1], l[3], l[4], l[0], l[3], l[5]};
    corners.insert(corners.end(), t, t + 9);
  }
  double sum = 0.0;
  for (auto _ : state)
    sum += RKMBenchBuildCGALTree(corners);
  benchmark::DoNotOptimize(sum);
  state.SetItemsProcessed(state.iterations() * state.range(0));
}
}
BENCHMARK(BM_CGAL_AABBTree)->Arg(10000)->Arg(100000)->Arg(1000000)->Unit(benchmark::kMillisecond);
#endif

BENCHMARK(BM_Ours_Basic)->Arg(10000)->Arg(100000)->Arg(1000000)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_Ours_Best)->Arg(1000)->Arg(10000)->Unit(benchmark::kMillisecond);
#ifdef RKM_BENCH_WITH_EMBREE
BENCHMARK(BM_Embree_Build)->Arg(10000)->Arg(100000)->Arg(1000000)->Unit(benchmark::kMillisecond);
#endif

BENCHMARK_MAIN();
