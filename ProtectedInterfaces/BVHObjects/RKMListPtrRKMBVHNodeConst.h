#pragma once

#include "RKMExport.h"
#include "RKMRawColl.h"

class RKMBVHNodeConst;

/// List of node pointers, positions 1 to Size(); it never owns the nodes.
class RKM_EXPORT RKMListPtrRKMBVHNodeConst
{
public:
  explicit RKMListPtrRKMBVHNodeConst(int initialCapacity = 0) : m_list(initialCapacity) {}
  RKMListPtrRKMBVHNodeConst(const RKMListPtrRKMBVHNodeConst &) = default;
  RKMListPtrRKMBVHNodeConst &operator=(const RKMListPtrRKMBVHNodeConst &) = default;
  virtual ~RKMListPtrRKMBVHNodeConst();

  bool operator==(const RKMListPtrRKMBVHNodeConst &o) const { return m_list == o.m_list; }
  bool operator!=(const RKMListPtrRKMBVHNodeConst &o) const { return !(*this == o); }
  /// Position 1 … Size(); out of range reads as null and a write there is discarded.
  RKMBVHNodeConst *&operator[](int pos) { return reinterpret_cast<RKMBVHNodeConst *&>(m_list[pos]); }
  RKMBVHNodeConst *operator[](int pos) const { return static_cast<RKMBVHNodeConst *>(m_list[pos]); }
  /// The new size, or 0 when memory runs out.
  int Append(RKMBVHNodeConst *node) { return m_list.Append(node); }
  /// Position of the first occurrence at or after start, or 0.
  int Locate(RKMBVHNodeConst *node, int start = 1) const { return m_list.Locate(node, start); }
  /// Removes the first occurrence; its position, or 0 when absent.
  int RemoveValue(RKMBVHNodeConst *node) { return m_list.RemoveValue(node); }
  void RemoveAll(RKMCollec mode = RKMCollecReleaseAllocatedMemory) { m_list.RemoveAll(mode); }
  int Size() const { return m_list.Size(); }

private:
  RKMRawCollPV m_list;
};
