#include "RKMSetOfFloatPoints.h"

#include <cstdlib>
#include <cstring>

namespace
{
constexpr int kSlotsPerBlock = 512;
// Slot indices are 32-bit; this many blocks keeps every index below 2^31.
constexpr int kMaxBlocks = (1 << 22);

RKMHTableDetail::GenericD SharedCompare()
{
  return RKMHTableDetail::GenericD{&RKMCompareFloatPoints::Shared(), nullptr};
}
}

RKMSetOfFloatPoints::RKMSetOfFloatPoints(int size) : m_table(size, SharedCompare()) {}

RKMSetOfFloatPoints::RKMSetOfFloatPoints(const RKMSetOfFloatPoints &other)
    : m_table(other.Size(), SharedCompare())
{
  CopyFrom(other);
}

RKMSetOfFloatPoints &RKMSetOfFloatPoints::operator=(const RKMSetOfFloatPoints &other)
{
  if (this == &other)
    return *this;
  RemoveAll();
  m_valid = true;
  CopyFrom(other);
  return *this;
}

RKMSetOfFloatPoints::~RKMSetOfFloatPoints() { ReleasePool(); }

void RKMSetOfFloatPoints::CopyFrom(const RKMSetOfFloatPoints &other)
{
  if (!other.IsValid())
  {
    m_valid = false;
    return;
  }
  for (Iterator it(other); !it.End(); ++it)
    if (FAILED(Insert(*it)))
    {
      RemoveAll();
      m_valid = false;
      return;
    }
}

// The free list is threaded through the slots themselves: the first word of a free slot holds 1 + the
// index of the next free slot, as a 32-bit integer (a pointer would not fit a 12-byte slot's alignment).
float *RKMSetOfFloatPoints::TakeSlot()
{
  if (m_freeHead)
  {
    const std::uint32_t index = m_freeHead - 1;
    float *slot = m_blocks[index / kSlotsPerBlock] + 3 * (index % kSlotsPerBlock);
    std::memcpy(&m_freeHead, slot, sizeof m_freeHead);
    return slot;
  }
  if (m_blockCount == 0 || m_usedInLastBlock == kSlotsPerBlock)
  {
    if (m_blockCount == kMaxBlocks)
      return nullptr;
    if (m_blockCount == m_blockRoom)
    {
      const int room = m_blockRoom ? 2 * m_blockRoom : 8;
      float **blocks = static_cast<float **>(std::realloc(m_blocks, sizeof(float *) * static_cast<size_t>(room)));
      if (!blocks)
        return nullptr;
      m_blocks = blocks;
      m_blockRoom = room;
    }
    float *block = static_cast<float *>(std::malloc(sizeof(float) * 3 * kSlotsPerBlock));
    if (!block)
      return nullptr;
    m_blocks[m_blockCount++] = block;
    m_usedInLastBlock = 0;
  }
  return m_blocks[m_blockCount - 1] + 3 * (m_usedInLastBlock++);
}

void RKMSetOfFloatPoints::ReturnSlot(float *slot)
{
  for (int b = 0; b < m_blockCount; ++b)
  {
    const float *base = m_blocks[b];
    if (slot >= base && slot < base + 3 * kSlotsPerBlock)
    {
      std::memcpy(slot, &m_freeHead, sizeof m_freeHead);
      m_freeHead = static_cast<std::uint32_t>(b * kSlotsPerBlock + (slot - base) / 3) + 1;
      return;
    }
  }
}

void RKMSetOfFloatPoints::ReleasePool()
{
  for (int b = 0; b < m_blockCount; ++b)
    std::free(m_blocks[b]);
  std::free(m_blocks);
  m_blocks = nullptr;
  m_blockCount = m_blockRoom = m_usedInLastBlock = 0;
  m_freeHead = 0;
}

HRESULT RKMSetOfFloatPoints::Insert(const float *xyz, const float **stored)
{
  if (stored)
    *stored = nullptr;
  if (!xyz)
    return E_INVALIDARG;
  if (const float *present = m_table.Find(xyz))
  {
    if (stored)
      *stored = present;
    return S_FALSE;
  }
  float *slot = TakeSlot();
  if (!slot)
    return E_FAIL;
  slot[0] = xyz[0];
  slot[1] = xyz[1];
  slot[2] = xyz[2];
  const HRESULT hr = m_table.Insert(slot);
  if (FAILED(hr))
  {
    ReturnSlot(slot);
    return hr;
  }
  if (stored)
    *stored = slot;
  return S_OK;
}

HRESULT RKMSetOfFloatPoints::Insert(float x, float y, float z, const float **stored)
{
  const float xyz[3] = {x, y, z};
  return Insert(xyz, stored);
}

const float *RKMSetOfFloatPoints::Find(const float *xyz) const { return xyz ? m_table.Find(xyz) : nullptr; }

HRESULT RKMSetOfFloatPoints::Remove(const float *xyz)
{
  const float *present = Find(xyz);
  if (!present)
    return S_FALSE;
  m_table.Remove(present);
  ReturnSlot(const_cast<float *>(present));
  return S_OK;
}

void RKMSetOfFloatPoints::RemoveAll()
{
  m_table.RemoveAll();
  ReleasePool();
}
