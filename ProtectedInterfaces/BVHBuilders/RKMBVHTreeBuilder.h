#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMBVHNode;
class RKMBVHNodeConst;
class RKMBVHNodeIterator;
class RKMBVHTree;

/// Builds a hierarchy over the caller's leaves (nodes with a first bounding volume) by creating the
/// inner nodes above them. Every usable leaf appears exactly once and every inner node encloses its
/// children; the leaves themselves are never changed, and end up owned by the tree.
class RKM_EXPORT RKMBVHTreeBuilder
{
public:
  enum SpatialOptimization
  {
    /// One root over all the leaves.
    NoOptim = 0,
    /// A 16 × 16 × 16 grid of leaf centres reduced by 2 × 2 × 2 blocks: linear time.
    Basic = 1,
    /// Greedy bottom-up merging by smallest union volume: quadratic time, tighter trees.
    Best = 2
  };

  explicit RKMBVHTreeBuilder(SpatialOptimization optimization = Basic) : optimization(optimization) {}

  /// The iterator is walked several times and must give the same sequence each time; null entries and
  /// entries without a first volume are skipped. S_OK with a new tree (count 1, the caller's);
  /// E_INVALIDARG when there is no usable leaf, E_NOTIMPL for an unknown strategy, E_OUTOFMEMORY when
  /// memory runs out (the inner nodes made so far are freed, the leaves left as they were): tree is
  /// untouched on failure.
  HRESULT Run(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const;

private:
  HRESULT RunNoOptim(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const;
  HRESULT RunBasic(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const;
  HRESULT RunBest(RKMBVHNodeIterator &leaves, RKMBVHTree *&tree) const;
  /// A new node over a and b, its volume cloned from a's and grown over both; null when either is null
  /// or memory runs out.
  RKMBVHNode *GetUnionFather(RKMBVHNodeConst *a, RKMBVHNodeConst *b) const;

  SpatialOptimization optimization;
};
