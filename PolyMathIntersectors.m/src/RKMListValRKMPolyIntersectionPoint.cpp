#include "RKMListValRKMPolyIntersectionPoint.h"

#include <new>

namespace
{
// What a position out of range reads as.
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
