#include "RKMPolyIntersectionPointBuckets.h"

#include <cstdlib>
#include <new>

namespace
{
// What a position out of range reads as.
const RKMPolyIntersectionPoint kZeroPoint;
}

RKMPolyIntersectionPointBuckets::~RKMPolyIntersectionPointBuckets()
{
  for (unsigned b = 0; b < m_blockCapacity; ++b)
    delete[] m_blocks[b];
  std::free(m_blocks);
}

unsigned RKMPolyIntersectionPointBuckets::PushBack(const RKMPolyIntersectionPoint &point)
{
  if (m_size == ~0u)
    return 0;
  const unsigned block = m_size / kBlock;
  if (block >= m_blockCapacity)
  {
    const unsigned capacity = m_blockCapacity ? 2 * m_blockCapacity : 4;
    auto **grown = static_cast<RKMPolyIntersectionPoint **>(
        std::realloc(m_blocks, static_cast<size_t>(capacity) * sizeof(RKMPolyIntersectionPoint *)));
    if (!grown)
      return 0;
    for (unsigned b = m_blockCapacity; b < capacity; ++b)
      grown[b] = nullptr;
    m_blocks = grown;
    m_blockCapacity = capacity;
  }
  if (!m_blocks[block])
  {
    m_blocks[block] = new (std::nothrow) RKMPolyIntersectionPoint[kBlock];
    if (!m_blocks[block])
      return 0;
  }
  m_blocks[block][m_size % kBlock] = point;
  return ++m_size;
}

const RKMPolyIntersectionPoint &RKMPolyIntersectionPointBuckets::operator[](unsigned i) const
{
  if (i < 1 || i > m_size)
    return kZeroPoint;
  return m_blocks[(i - 1) / kBlock][(i - 1) % kBlock];
}

RKMPolyIntersectionPoint &RKMPolyIntersectionPointBuckets::operator[](unsigned i)
{
  if (i < 1 || i > m_size)
  {
    m_outOfRange = RKMPolyIntersectionPoint();
    return m_outOfRange;
  }
  return m_blocks[(i - 1) / kBlock][(i - 1) % kBlock];
}
