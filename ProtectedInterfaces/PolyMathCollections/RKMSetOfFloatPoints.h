#pragma once

#include "RKMCompareFloatPoints.h"
#include "RKMExport.h"
#include "RKMHTableTyped.h"

#include <cstdint>

/// Set of float triples, each copied into the set's own pool: the address of a stored triple stays
/// valid until that triple is removed or the set is emptied or destroyed.
class RKM_EXPORT RKMSetOfFloatPoints
{
public:
  explicit RKMSetOfFloatPoints(int size = 0);
  /// A copy stores the same triples at new addresses; when memory runs out it holds none of them
  /// and IsValid is false.
  RKMSetOfFloatPoints(const RKMSetOfFloatPoints &other);
  RKMSetOfFloatPoints &operator=(const RKMSetOfFloatPoints &other);
  ~RKMSetOfFloatPoints();

  /// S_OK when the triple was copied in, S_FALSE when an equal triple is stored; E_FAIL when no slot
  /// can be had, E_OUTOFMEMORY when the table cannot grow, E_INVALIDARG for null. stored, when given,
  /// receives the stored triple's address (null on failure).
  HRESULT Insert(const float *xyz, const float **stored = nullptr);
  HRESULT Insert(float x, float y, float z, const float **stored = nullptr);
  /// The stored triple equal to xyz, or null.
  const float *Find(const float *xyz) const;
  unsigned char Locate(const float *xyz) const { return Find(xyz) != nullptr; }
  /// S_OK when removed (its slot is reused first), S_FALSE when absent.
  HRESULT Remove(const float *xyz);
  void RemoveAll();
  int Size() const { return m_table.Size(); }
  /// False when a copy or a construction ran out of memory; the set then holds nothing.
  unsigned char IsValid() const { return m_table.Capacity() != 0 && m_valid; }

  /// Walks the stored triples in entry order, as they stand when it is built.
  class Iterator
  {
  public:
    explicit Iterator(const RKMSetOfFloatPoints &s) : m_it(s.m_table) {}
    unsigned char End() const { return m_it.End(); }
    Iterator &operator++()
    {
      ++m_it;
      return *this;
    }
    const float *operator*() const { return *m_it; }
    const float *GetFloats() const { return *m_it; }

  private:
    RKMTypedSet<const float *, RKMHTableDetail::GenericD>::Iterator m_it;
  };

private:
  float *TakeSlot();
  void ReturnSlot(float *slot);
  void ReleasePool();
  void CopyFrom(const RKMSetOfFloatPoints &other);

  RKMTypedSet<const float *, RKMHTableDetail::GenericD> m_table;
  float **m_blocks = nullptr;
  int m_blockCount = 0;
  int m_blockRoom = 0;
  int m_usedInLastBlock = 0;
  /// 1 + the index of the first free slot, 0 when none.
  std::uint32_t m_freeHead = 0;
  bool m_valid = true;
};
