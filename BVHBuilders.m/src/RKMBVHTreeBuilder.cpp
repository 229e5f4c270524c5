#include "RKMBVHNode.h"
#include "RKMBVHNodeIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeBuilder.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBoundingVolume.h"
#include "RKMPolyDebugStackTrace.h"

#include "RKMMathBox.h"

#include <algorithm>
#include <cmath>
#include <new>
#include <vector>

namespace
{
bool Usable(const RKMBVHNode *n) { return n && n->GetFirstBoundingVolume(); }

// A new node without children whose volume is a clone of model's first volume; null when memory runs out.
RKMBVHNode *NodeLike(const RKMBVHNodeConst *model)
{
  RKMPolyBoundingVolume *volume = RKMPolyBVClone::Clone(model->GetFirstBoundingVolume());
  if (!volume)
    return nullptr;
  RKMBVHNode *node = new RKMBVHNode(volume);
  if (!node)
    delete volume;
  return node;
}

// The inner nodes of one build. On failure they are unlinked from their children (the leaves stay the
// caller's, the inner nodes are freed one by one) and deleted.
class Build
{
public:
  ~Build()
  {
    if (m_keep)
      return;
    for (RKMBVHNode *n : m_inner)
    {
      n->RemoveAllChildren();
      delete n;
    }
  }

  // A new inner node over children (two or more, non-null), its volume cloned from the first child's
  // and grown over each. Null when memory runs out.
  RKMBVHNode *Parent(RKMBVHNodeConst *const *children, size_t count)
  {
    RKMBVHNode *node = Empty(children[0]);
    if (!node)
      return nullptr;
    for (size_t i = 0; i < count; ++i)
      if (node->AbsorbChild(children[i]) <= 0)
        return nullptr;
    return node;
  }

  // A new inner node without children, its volume cloned from model's. Null when memory runs out.
  RKMBVHNode *Empty(const RKMBVHNodeConst *model)
  {
    RKMBVHNode *node = NodeLike(model);
    if (!node)
      return nullptr;
    try
    {
      m_inner.push_back(node);
    }
    catch (...)
    {
      delete node;
      return nullptr;
    }
    return node;
  }

  // Wraps the root into a tree; on failure the build is undone.
  HRESULT Finish(RKMBVHNodeConst *root, RKMBVHTree *&tree)
  {
    RKMBVHTree *made = new (std::nothrow) RKMBVHTree(static_cast<RKMBVHNode *>(root));
    if (!made)
      return E_OUTOFMEMORY;
    m_keep = true;
    tree = made;
    return S_OK;
  }

private:
  std::vector<RKMBVHNode *> m_inner;
  bool m_keep = false;
};

// The usable leaves of the iterator in order; false when memory runs out.
bool Collect(RKMBVHNodeIterator &leaves, std::vector<RKMBVHNodeConst *> &usable)
{
  try
  {
    for (leaves.Begin(); !leaves.End(); ++leaves)
    {
      RKMBVHNode *n = *leaves;
      if (Usable(n))
        usable.push_back(n);
    }
  }
  catch (...)
  {
    return false;
  }
  return true;
}

// The common start: E_INVALIDARG for an iterator empty at once or without usable leaf.
HRESULT Start(RKMBVHNodeIterator &leaves, std::vector<RKMBVHNodeConst *> &usable)
{
  leaves.Begin();
  if (leaves.End())
    return E_INVALIDARG;
  if (!Collect(leaves, usable))
    return E_OUTOFMEMORY;
  return usable.empty() ? E_INVALIDARG : S_OK;
}

// One leaf: the tree's root is the leaf itself. More: one root over all of them, its volume started
// from the second leaf's and grown over each.
HRESULT Flat(Build &build, const std::vector<RKMBVHNodeConst *> &usable, RKMBVHTree *&tree)
{
  if (usable.size() == 1)
    return build.Finish(usable[0], tree);
  RKMBVHNode *root = build.Empty(usable[1]);
  if (!root)
    return E_OUTOFMEMORY;
  for (RKMBVHNodeConst *leaf : usable)
    if (root->AbsorbChild(leaf) <= 0)
      return E_OUTOFMEMORY;
  return build.Finish(root, tree);
}

int Cell(double v, double lower, double scale, int resolution)
{
  // Clamped into the grid: a centre on the upper limit, or a NaN, still lands in a cell.
  const double x = (v - lower) * scale;
  if (!(x >= 0.0))
    return 0;
  if (x >= resolution - 1)
    return resolution - 1;
  return static_cast<int>(x);
}

// The grid hierarchy over three or more leaves: their centres binned into a 16 × 16 × 16 grid,
// one node per occupied cell, reduced by 2 × 2 × 2 blocks. A cell that holds more than a handful of
// leaves is gridded again over its own centres, a few times at most: left flat, a crowded cell makes
// every pair walk through it test all its leaves against all of another's. Null when memory runs
// out (oom set) or, should it happen, when nothing is left at the top.
constexpr size_t kMaxCellLeaves = 8;
constexpr int kMaxGridDepth = 3;

RKMBVHNodeConst *GridTree(Build &build, const std::vector<RKMBVHNodeConst *> &usable, int depth, bool &oom)
{
  const size_t n = usable.size();
  // The top grid is 16 cells a side. A crowded cell's own grid is as fine as its leaves need, about
  // two per cell, so that its fixed cost follows their number.
  int res = 16;
  if (depth > 0)
  {
    res = 2;
    while (res < 16 && static_cast<size_t>(res) * res * res < n / 2)
      res *= 2;
  }
  const int kCells = res * res * res;
  // The leaves are ordered by cell with a counting sort, keeping the iteration order within a cell:
  // a call costs a few arrays, not one list per cell, which matters as crowded cells call again.
  std::vector<RKMMathPoint> centres;
  std::vector<int> cellOf;
  std::vector<size_t> start, next;
  std::vector<RKMBVHNodeConst *> byCell, grid, level;
  try
  {
    centres.reserve(n);
    cellOf.resize(n);
    start.assign(static_cast<size_t>(kCells) + 1, 0);
    next.resize(static_cast<size_t>(kCells));
    byCell.resize(n);
    grid.assign(static_cast<size_t>(kCells), nullptr);
    level.reserve(64);
  }
  catch (...)
  {
    oom = true;
    return nullptr;
  }
  RKMMathBox bounds;
  for (RKMBVHNodeConst *leaf : usable)
  {
    centres.push_back(RKMPolyBVProperties::GetCenter(leaf->GetFirstBoundingVolume()));
    bounds.AddInside(centres.back());
  }
  double lo[3], hi[3];
  bounds.GetLimits(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]);
  // The top grid keeps its leaves off the limits by a fixed margin in model units; a cell's own grid
  // needs none (a centre on the upper limit is clamped into the last cell), and a fixed margin would
  // swamp a small cell.
  const double margin = depth == 0 ? 0.01 : 0.0;
  double scale[3];
  for (int a = 0; a < 3; ++a)
  {
    lo[a] -= margin;
    hi[a] += margin;
    scale[a] = res / (hi[a] - lo[a]);
  }
  for (size_t k = 0; k < n; ++k)
  {
    const int ix = Cell(centres[k].x, lo[0], scale[0], res), iy = Cell(centres[k].y, lo[1], scale[1], res),
              iz = Cell(centres[k].z, lo[2], scale[2], res);
    cellOf[k] = (ix * res + iy) * res + iz;
    ++start[static_cast<size_t>(cellOf[k]) + 1];
  }
  for (int c = 0; c < kCells; ++c)
    start[static_cast<size_t>(c) + 1] += start[static_cast<size_t>(c)];
  std::copy(start.begin(), start.end() - 1, next.begin());
  for (size_t k = 0; k < n; ++k)
    byCell[next[static_cast<size_t>(cellOf[k])]++] = usable[k];
  // Level 0: one node per cell of two or more leaves.
  std::vector<RKMBVHNodeConst *> cell;
  for (int c = 0; c < kCells; ++c)
  {
    const size_t first = start[static_cast<size_t>(c)], count = start[static_cast<size_t>(c) + 1] - first;
    if (count == 1)
      grid[static_cast<size_t>(c)] = byCell[first];
    else if (count > 1)
    {
      // Only a cell that holds fewer than all the leaves is gridded again, so that coincident
      // centres end in one flat node instead of recursing.
      RKMBVHNodeConst *node = nullptr;
      if (count > kMaxCellLeaves && depth < kMaxGridDepth && count < n)
      {
        try
        {
          cell.assign(byCell.begin() + static_cast<long>(first), byCell.begin() + static_cast<long>(first + count));
        }
        catch (...)
        {
          oom = true;
          return nullptr;
        }
        node = GridTree(build, cell, depth + 1, oom);
      }
      else
        node = build.Parent(byCell.data() + first, count);
      if (!node)
      {
        oom = true;
        return nullptr;
      }
      grid[static_cast<size_t>(c)] = node;
    }
  }
  // Each coarser level gathers 2 × 2 × 2 cells; a single result passes up, never a one-child node.
  for (int m = res / 2; m >= 1; m /= 2)
  {
    const int fine = 2 * m;
    level.clear();
    for (int x = 0; x < m; ++x)
      for (int y = 0; y < m; ++y)
        for (int z = 0; z < m; ++z)
        {
          RKMBVHNodeConst *gathered[8];
          size_t count = 0;
          for (int d = 0; d < 8; ++d)
          {
            const int fx = 2 * x + (d >> 2), fy = 2 * y + ((d >> 1) & 1), fz = 2 * z + (d & 1);
            if (RKMBVHNodeConst *node = grid[static_cast<size_t>((fx * fine + fy) * fine + fz)])
              gathered[count++] = node;
          }
          RKMBVHNodeConst *result = nullptr;
          if (count == 1)
            result = gathered[0];
          else if (count > 1 && !(result = build.Parent(gathered, count)))
          {
            oom = true;
            return nullptr;
          }
          grid[static_cast<size_t>((x * m + y) * m + z)] = result;
          if (result)
            level.push_back(result);
        }
  }
  if (level.empty())
    return nullptr;
  RKMBVHNodeConst *root = level[0];
  if (level.size() > 1 && !(root = build.Parent(level.data(), level.size())))
    oom = true;
  return oom ? nullptr : root;
}
} // namespace

HRESULT RKMBVHTreeBuilder::Run(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const
{
  RKMPolyDebugStackTrace scope(R"(RKMBVHTreeBuilder::Run [RezazizuviVaveverodiz\BVHBuilders.m\src\RKMBVHTreeBuilder:105])",
                               11);
  switch (optimization)
  {
  case NoOptim:
    return RunNoOptim(leaves, tree);
  case Basic:
    return RunBasic(leaves, tree);
  case Best:
    return RunBest(leaves, tree);
  }
  return E_NOTIMPL;
}

RKMBVHNode *RKMBVHTreeBuilder::GetUnionFather(RKMBVHNodeConst *a, RKMBVHNodeConst *b) const
{
  if (!a || !b || !a->GetFirstBoundingVolume() || !b->GetFirstBoundingVolume())
    return nullptr;
  RKMBVHNode *node = NodeLike(a);
  if (!node)
    return nullptr;
  node->AbsorbChild(a);
  node->AbsorbChild(b);
  return node;
}

HRESULT RKMBVHTreeBuilder::RunNoOptim(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const
{
  std::vector<RKMBVHNodeConst *> usable;
  const HRESULT hr = Start(leaves, usable);
  if (FAILED(hr))
    return hr;
  Build build;
  return Flat(build, usable, tree);
}

HRESULT RKMBVHTreeBuilder::RunBasic(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const
{
  std::vector<RKMBVHNodeConst *> usable;
  const HRESULT hr = Start(leaves, usable);
  if (FAILED(hr))
    return hr;
  Build build;
  if (usable.size() <= 2)
    return Flat(build, usable, tree);
  bool oom = false;
  RKMBVHNodeConst *root = GridTree(build, usable, 0, oom);
  if (!root)
    return oom ? E_OUTOFMEMORY : E_FAIL;
  return build.Finish(root, tree);
}

HRESULT RKMBVHTreeBuilder::RunBest(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const
{
  std::vector<RKMBVHNodeConst *> usable;
  const HRESULT hr = Start(leaves, usable);
  if (FAILED(hr))
    return hr;
  const size_t n = usable.size();
  Build build;
  if (n == 1)
    return build.Finish(usable[0], tree);

  // Clusters, each a node (an input leaf or a node made here) with its best partner and the cost of
  // merging with it (the volume of their union). Costs order with NaN last, so the choice is total.
  struct Cluster
  {
    RKMBVHNodeConst *node;
    bool leaf;
    bool alive;
    size_t partner;
    double cost;
  };
  std::vector<Cluster> clusters;
  try
  {
    clusters.reserve(n);
  }
  catch (...)
  {
    return E_OUTOFMEMORY;
  }
  for (RKMBVHNodeConst *leaf : usable)
    clusters.push_back({leaf, true, true, 0, 0.0});
  auto less = [](double a, double b) { return std::isnan(b) ? !std::isnan(a) : a < b; };
  auto bestPartner = [&](size_t i) {
    Cluster &c = clusters[i];
    bool found = false;
    for (size_t j = 0; j < clusters.size(); ++j)
    {
      if (j == i || !clusters[j].alive)
        continue;
      const double cost = RKMPolyBVBVOperations::GetVolumeOfUnion(c.node->GetFirstBoundingVolume(),
                                                                  clusters[j].node->GetFirstBoundingVolume());
      if (!found || less(cost, c.cost))
      {
        c.partner = j;
        c.cost = cost;
        found = true;
      }
    }
  };
  for (size_t i = 0; i < n; ++i)
    bestPartner(i);
  size_t alive = n;
  while (alive > 2)
  {
    size_t a = n;
    for (size_t i = 0; i < clusters.size(); ++i)
      if (clusters[i].alive && (a == n || less(clusters[i].cost, clusters[a].cost)))
        a = i;
    const size_t b = clusters[a].partner;
    Cluster &A = clusters[a], &B = clusters[b];
    const double vA = RKMPolyBVProperties::GetVolume(A.node->GetFirstBoundingVolume());
    const double vB = RKMPolyBVProperties::GetVolume(B.node->GetFirstBoundingVolume());
    const double c = A.cost;
    RKMBVHNodeConst *merged;
    // Two input leaves, or a union much larger than both, get a new parent; otherwise the smaller joins
    // the larger as one more child. An input leaf never gains children.
    if ((A.leaf && B.leaf) || (c > 3.0 * vA && c > 3.0 * vB))
    {
      RKMBVHNodeConst *pair[2] = {A.node, B.node};
      if (!(merged = build.Parent(pair, 2)))
        return E_OUTOFMEMORY;
    }
    else
    {
      const bool intoB = A.leaf || (!B.leaf && !(vA > vB));
      RKMBVHNode *target = static_cast<RKMBVHNode *>(intoB ? B.node : A.node);
      if (target->AbsorbChild(intoB ? A.node : B.node) <= 0)
        return E_OUTOFMEMORY;
      merged = target;
    }
    B.node = merged;
    B.leaf = false;
    A.alive = false;
    --alive;
    for (size_t i = 0; i < clusters.size(); ++i)
      if (clusters[i].alive && (i == b || clusters[i].partner == a || clusters[i].partner == b))
        bestPartner(i);
  }
  RKMBVHNodeConst *last[2];
  size_t count = 0;
  for (const Cluster &c : clusters)
    if (c.alive)
      last[count++] = c.node;
  RKMBVHNode *root = build.Parent(last, count);
  if (!root)
    return E_OUTOFMEMORY;
  return build.Finish(root, tree);
}
