#pragma once

#include "RKMExport.h"
#include "RKMListPtrRKMBVHNodeConst.h"

class RKMBVHAttribute;
class RKMPolyBoundingVolume;

/// The read-only face of a hierarchy node: children in the order they were added, up to two bounding
/// volumes and an attribute, all owned by the node. A node has no parent link and cannot be copied
/// (two copies would own the same children).
class RKM_EXPORT RKMBVHNodeConst
{
public:
  typedef int BVHNodeType;

  RKMBVHNodeConst(const RKMBVHNodeConst &) = delete;
  RKMBVHNodeConst &operator=(const RKMBVHNodeConst &) = delete;
  /// Deletes the whole subtree (without recursion, so a degenerate chain of any depth is safe), then the
  /// volumes and the attribute.
  virtual ~RKMBVHNodeConst();

  virtual const RKMPolyBoundingVolume *GetSecondBoundingVolume() const { return m_bv2; }
  virtual int GetNbChildren() const { return m_children.Size(); }
  virtual RKMBVHAttribute *GetAttribute() const { return m_attribute; }
  /// ForceExpand, ForceCollapse and FlushMemory recurse into the children (null ones skipped);
  /// FlushMemory then flushes the attribute's computed data.
  virtual void ForceExpand();
  virtual void ForceCollapse(int level);
  virtual void FlushMemory();
  virtual RKMListPtrRKMBVHNodeConst &GetChildren() { return m_children; }
  /// 0 here.
  virtual BVHNodeType GetType() { return 0; }

  const RKMPolyBoundingVolume *GetFirstBoundingVolume() const { return m_bv1; }
  const RKMListPtrRKMBVHNodeConst &GetChildren() const { return m_children; }

  /// Walks positions 1 to size of the children list GetChildren gives at construction; the list is
  /// read as it stands at each step.
  class RKM_EXPORT ConstIterator
  {
  public:
    explicit ConstIterator(RKMBVHNodeConst &node) : m_list(&node.GetChildren()), m_pos(1) {}
    ConstIterator &Begin()
    {
      m_pos = 1;
      return *this;
    }
    unsigned char End() const { return m_pos > m_list->Size(); }
    ConstIterator &operator++()
    {
      ++m_pos;
      return *this;
    }
    const RKMBVHNodeConst *operator*() const { return (*m_list)[m_pos]; }

  private:
    RKMListPtrRKMBVHNodeConst *m_list;
    int m_pos;
  };

protected:
  RKMBVHNodeConst() = default;
  explicit RKMBVHNodeConst(RKMPolyBoundingVolume *bv) : m_bv1(bv) {}

  RKMListPtrRKMBVHNodeConst m_children;
  RKMPolyBoundingVolume *m_bv1 = nullptr;
  RKMPolyBoundingVolume *m_bv2 = nullptr;
  RKMBVHAttribute *m_attribute = nullptr;
};
