#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMBVHNodeConst;
class RKMBVHTree;

/// Depth-first walk of one hierarchy or of a pair, driven by hooks that a derived class overrides:
/// Filter prunes, Choose picks the side to open, ProcessLeafNode(s) handle leaves, IsStopped ends the
/// walk, End follows every pair that passed Filter. One operator serves one walk at a time.
class RKM_EXPORT RKMBVHDescentOperator
{
public:
  RKMBVHDescentOperator() = default;
  RKMBVHDescentOperator(const RKMBVHDescentOperator &) = default;
  RKMBVHDescentOperator &operator=(const RKMBVHDescentOperator &) = default;
  virtual ~RKMBVHDescentOperator();

  /// Walks one tree from its root. E_INVALIDARG when it has none; otherwise the walk's result.
  HRESULT Descend(RKMBVHTree &tree);
  /// Walks two trees from their roots. E_INVALIDARG when either has none; otherwise the walk's result.
  HRESULT Descend(RKMBVHTree &first, RKMBVHTree &second);

  int GetDepth() const { return depth; }
  int GetDepth1() const { return depth1; }
  int GetDepth2() const { return depth2; }

  /// Choose's answers; any other value opens both sides, as ChooseBoth does.
  enum ChooseSide : int
  {
    ChooseBoth = 0,
    ChooseFirst = 1,
    ChooseSecond = 2
  };

protected:
  /// Keeps the pair (true) or prunes it.
  virtual unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b);
  virtual unsigned char Filter(RKMBVHNodeConst &node);
  virtual HRESULT ProcessLeafNode(RKMBVHNodeConst &node);
  /// True ends the walk at the next point where it is asked.
  virtual unsigned char IsStopped();
  virtual HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b);
  /// ChooseFirst opens only a's children, ChooseSecond only b's, anything else both.
  virtual int Choose(RKMBVHNodeConst &a, RKMBVHNodeConst &b);
  /// Called after a pair that passed Filter has been handled.
  virtual void End(RKMBVHNodeConst &a, RKMBVHNodeConst &b);

  /// The single-tree walk from any node.
  HRESULT Descend(RKMBVHNodeConst &node);
  /// The pair walk from any two nodes.
  HRESULT Descend(RKMBVHNodeConst &a, RKMBVHNodeConst &b);

  /// Depth of the current node of a single walk (0 at the root; −1 before any walk).
  int depth = -1;
  /// Depths in the first and second trees of a pair walk.
  int depth1 = -1;
  int depth2 = -1;
};
