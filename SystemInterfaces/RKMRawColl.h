#pragma once

#include <cstddef>
#include <new>
#include <vector>

/// What RemoveAll does with the list's storage.
enum RKMCollec
{
  RKMCollecKeepAllocatedMemory = 0,
  RKMCollecReleaseAllocatedMemory = 1
};

/// Growable list of values, positions 1 to Size(). An allocation failure leaves the list as it was
/// and is reported by the return value; a position out of range reads as a zero value and a write
/// to it is discarded.
template <class T>
class RKMRawColl
{
public:
  explicit RKMRawColl(int initialCapacity = 0)
  {
    if (initialCapacity > 0)
      try { m_values.reserve(static_cast<size_t>(initialCapacity)); } catch (...) {}
  }

  int Size() const { return static_cast<int>(m_values.size()); }

  /// The new size, or 0 when memory runs out.
  int Append(const T &value)
  {
    try { m_values.push_back(value); } catch (...) { return 0; }
    return Size();
  }
  /// Inserts before position pos (1 … Size() + 1). The new size, or 0 on a bad position or no memory.
  int InsertAt(int pos, const T &value)
  {
    if (pos < 1 || pos > Size() + 1)
      return 0;
    try { m_values.insert(m_values.begin() + (pos - 1), value); } catch (...) { return 0; }
    return Size();
  }

  T &operator[](int pos)
  {
    if (pos < 1 || pos > Size())
    {
      m_outOfRange = T();
      return m_outOfRange;
    }
    return m_values[static_cast<size_t>(pos - 1)];
  }
  T operator[](int pos) const
  {
    return (pos < 1 || pos > Size()) ? T() : m_values[static_cast<size_t>(pos - 1)];
  }

  /// Position of the first value equal to v at or after start, or 0.
  int Locate(const T &v, int start = 1) const
  {
    for (int i = (start < 1 ? 1 : start); i <= Size(); ++i)
      if (m_values[static_cast<size_t>(i - 1)] == v)
        return i;
    return 0;
  }
  /// Removes position pos; the later values move down. Returns the new size, or -1 on a bad position.
  int RemovePosition(int pos)
  {
    if (pos < 1 || pos > Size())
      return -1;
    m_values.erase(m_values.begin() + (pos - 1));
    return Size();
  }
  /// Removes the first occurrence of v; gives its position, or 0 when absent.
  int RemoveValue(const T &v)
  {
    int pos = Locate(v);
    if (pos)
      RemovePosition(pos);
    return pos;
  }
  void RemoveAll(RKMCollec mode = RKMCollecReleaseAllocatedMemory)
  {
    m_values.clear();
    if (mode == RKMCollecReleaseAllocatedMemory)
      m_values.shrink_to_fit();
  }
  /// Exchanges the values at two positions; nothing when either is out of range.
  void Swap(int pos1, int pos2)
  {
    if (pos1 >= 1 && pos1 <= Size() && pos2 >= 1 && pos2 <= Size())
      std::swap(m_values[static_cast<size_t>(pos1 - 1)], m_values[static_cast<size_t>(pos2 - 1)]);
  }

  bool operator==(const RKMRawColl &o) const { return m_values == o.m_values; }
  bool operator!=(const RKMRawColl &o) const { return !(*this == o); }

  /// Contiguous storage of the values (position 1 first); null when empty.
  T *Data() { return m_values.empty() ? nullptr : m_values.data(); }
  const T *Data() const { return m_values.empty() ? nullptr : m_values.data(); }

private:
  std::vector<T> m_values;
  T m_outOfRange = T();
};

/// List of untyped pointers, positions from 1.
class RKMRawCollPV : public RKMRawColl<void *>
{
public:
  using RKMRawColl<void *>::RKMRawColl;
};

/// List of ints, positions from 1.
class RKMRawCollint : public RKMRawColl<int>
{
public:
  using RKMRawColl<int>::RKMRawColl;
};

/// List of doubles, positions from 1.
class RKMRawColldouble : public RKMRawColl<double>
{
public:
  using RKMRawColl<double>::RKMRawColl;
};
