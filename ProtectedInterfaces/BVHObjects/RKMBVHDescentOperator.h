#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

class RKMBVHNodeConst;
class RKMBVHTree;

/// Depth-first walk of one hierarchy or of a pair, children in list order (null ones skipped), driven
/// by hooks that a derived class overrides. One operator serves one walk at a time.
///
/// What a walk answers: a node, or a pair, that IsStopped or Filter turns away answers S_OK; a leaf
/// (a pair of leaves) answers its ProcessLeafNode (ProcessLeafNodes); any other answers as the last
/// child (child pair) it walked, S_OK when none. The single-tree walk ends at the first failed
/// ProcessLeafNode and hands that failure up. The pair walk carries on past a failed
/// ProcessLeafNodes, so the failure is lost unless it came from the last pair walked: an operator
/// that must not lose one records it itself, or ends the walk through IsStopped.
class RKM_EXPORT RKMBVHDescentOperator
{
public:
  RKMBVHDescentOperator() = default;
  RKMBVHDescentOperator(const RKMBVHDescentOperator &) = default;
  RKMBVHDescentOperator &operator=(const RKMBVHDescentOperator &) = default;
  virtual ~RKMBVHDescentOperator();

  /// Walks one tree from its root: E_INVALIDARG when it has none, otherwise the root's answer.
  HRESULT Descend(RKMBVHTree &tree);
  /// Walks two trees from their roots: E_INVALIDARG when either has none, otherwise the roots' answer.
  HRESULT Descend(RKMBVHTree &first, RKMBVHTree &second);

  int GetDepth() const { return depth; }
  int GetDepth1() const { return depth1; }
  int GetDepth2() const { return depth2; }

  /// Choose's answers: ChooseFirst opens only a's children, ChooseSecond only b's, ChooseBoth (and
  /// any other value) every pair of them, a's children outermost. A leaf is never opened: with one
  /// side a leaf, the other side opens whatever the answer.
  enum ChooseSide : int
  {
    ChooseBoth = 0,
    ChooseFirst = 1,
    ChooseSecond = 2
  };

protected:
  /// Keeps the pair (true) or prunes it.
  virtual unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b);
  /// Keeps the node (true) or prunes it.
  virtual unsigned char Filter(RKMBVHNodeConst &node);
  virtual HRESULT ProcessLeafNode(RKMBVHNodeConst &node);
  /// True ends the walk: asked before each node or pair, and before each child or child pair.
  virtual unsigned char IsStopped();
  virtual HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b);
  /// Asked for each pair that passed Filter and is not two leaves; ChooseBoth here.
  virtual int Choose(RKMBVHNodeConst &a, RKMBVHNodeConst &b);
  /// Called for each pair that passed Filter, once it has been handled (its children walked, or the
  /// walk stopped).
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
