#include <cstdlib>
#include <new>

#include "RKMListValRKMPolyIntersectionPoint.h"
#include "RKMPolyIntersectionPointBuckets.h"

// Callers store and exchange the records as six ints.
static_assert(sizeof(RKMPolyIntersectionPoint) == 6 * sizeof(int), "an intersection point is six ints");

namespace
{
const RKMPolyIntersectionPoint kZeroPoint;
}

RKMListValRKMPolyIntersectionPoint::RKMListValRKMPolyIntersectionPoint(int initialCapacity)
    : m_points(initialCapacity)
{
}

RKMListValRKMPolyIntersectionPoint::RKMListValRKMPolyIntersectionPoint(const RKMListValRKMPolyIntersectionPoint &other)
{
  Append(other);
}

RKMListValRKMPolyIntersectionPoint &
RKMListValRKMPolyIntersectionPoint::operator=(const RKMListValRKMPolyIntersectionPoint &other)
{
  if (this != &other)
  {
    RemoveAll();
    Append(other);
  }
  return *this;
}

RKMListValRKMPolyIntersectionPoint::~RKMListValRKMPolyIntersectionPoint()
{
  RemoveAll();
}

int RKMListValRKMPolyIntersectionPoint::Append(const RKMPolyIntersectionPoint &point)
{
  return InsertAt(Size() + 1, point);
}

int RKMListValRKMPolyIntersectionPoint::Append(const RKMListValRKMPolyIntersectionPoint &other)
{
  const int before = Size();
  const int n = other.Size();
  for (int i = 1; i <= n; ++i)
    if (!Append(other[i]))
    {
      while (Size() > before)
        RemovePosition(Size());
      return 0;
    }
  return Size();
}

int RKMListValRKMPolyIntersectionPoint::InsertAt(int pos, const RKMPolyIntersectionPoint &point)
{
  if (pos < 1 || pos > Size() + 1)
    return 0;
  auto *copy = new (std::nothrow) RKMPolyIntersectionPoint(point);
  if (!copy)
    return 0;
  const int n = m_points.InsertAt(pos, copy);
  if (!n)
    delete copy;
  return n;
}

int RKMListValRKMPolyIntersectionPoint::RemovePosition(int pos)
{
  if (pos < 1 || pos > Size())
    return -1;
  delete static_cast<RKMPolyIntersectionPoint *>(m_points[pos]);
  return m_points.RemovePosition(pos);
}

void RKMListValRKMPolyIntersectionPoint::RemoveAll(RKMCollec mode)
{
  for (int i = 1; i <= Size(); ++i)
    delete static_cast<RKMPolyIntersectionPoint *>(m_points[i]);
  m_points.RemoveAll(mode);
}

const RKMPolyIntersectionPoint &RKMListValRKMPolyIntersectionPoint::operator[](int pos) const
{
  if (pos < 1 || pos > Size())
    return kZeroPoint;
  return *static_cast<const RKMPolyIntersectionPoint *>(m_points[pos]);
}

bool RKMListValRKMPolyIntersectionPoint::operator==(const RKMListValRKMPolyIntersectionPoint &other) const
{
  if (Size() != other.Size())
    return false;
  for (int i = 1; i <= Size(); ++i)
    if ((*this)[i] != other[i])
      return false;
  return true;
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
