#pragma once

#include "RKMBVHNodeConst.h"
#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <cstddef>

/// A hierarchy node that can be changed. Nodes come from the library's pool through class-level
/// allocation; a pool that runs dry makes new give null.
class RKM_EXPORT RKMBVHNode : public RKMBVHNodeConst
{
public:
  RKMBVHNode() = default;
  /// Takes ownership of bv as the first bounding volume.
  explicit RKMBVHNode(RKMPolyBoundingVolume *bv) : RKMBVHNodeConst(bv) {}

  virtual RKMPolyBoundingVolume *GetSecondBoundingVolume() { return m_bv2; }
  using RKMBVHNodeConst::GetSecondBoundingVolume;
  RKMPolyBoundingVolume *GetFirstBoundingVolume() { return m_bv1; }
  using RKMBVHNodeConst::GetFirstBoundingVolume;

  /// The three setters store their argument, owned from now on; the one it replaces is neither
  /// deleted nor returned.
  void SetFirstBoundingVolume(RKMPolyBoundingVolume *bv) { m_bv1 = bv; }
  void SetSecondBoundingVolume(RKMPolyBoundingVolume *bv) { m_bv2 = bv; }
  void SetAttribute(RKMBVHAttribute *attribute) { m_attribute = attribute; }

  /// Appends the child (owned from now on); the list's Append result (the new size, 0 when memory runs
  /// out). The volumes are not touched.
  HRESULT AddChild(RKMBVHNodeConst *child);
  /// Grows this node's volumes to enclose the child's, then appends it. E_INVALIDARG for null, E_FAIL
  /// (nothing changed) when either first volume is missing. When no volume of the node's kind can hold
  /// the child's (a slab or an infinite cylinder under a box), the node's volume becomes all of space,
  /// so that a walk never prunes the child.
  HRESULT AbsorbChild(RKMBVHNodeConst *child);
  /// Unlinks the first occurrence (not deleted; the volumes are not shrunk). E_FAIL when absent.
  HRESULT RemoveChild(RKMBVHNodeConst *child);
  /// Unlinks every child without deleting them.
  void RemoveAllChildren();

  static void *operator new(std::size_t size) noexcept;
  static void operator delete(void *p) noexcept;

  /// As RKMBVHNodeConst::ConstIterator, with children that can be changed.
  class RKM_EXPORT Iterator
  {
  public:
    explicit Iterator(RKMBVHNode &node) : m_list(&node.GetChildren()), m_pos(1) {}
    Iterator &Begin()
    {
      m_pos = 1;
      return *this;
    }
    unsigned char End() const { return m_pos > m_list->Size(); }
    Iterator &operator++()
    {
      ++m_pos;
      return *this;
    }
    RKMBVHNodeConst *operator*() const { return (*m_list)[m_pos]; }

  private:
    RKMListPtrRKMBVHNodeConst *m_list;
    int m_pos;
  };
};
