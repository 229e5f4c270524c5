#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersectionPoint.h"

/// Intersection points stored by value in blocks of 32 that never move, so a reference to a stored
/// point stays valid while the buckets live. Positions count from 1. Not copyable.
class RKM_EXPORT RKMPolyIntersectionPointBuckets
{
public:
  RKMPolyIntersectionPointBuckets() = default;
  RKMPolyIntersectionPointBuckets(const RKMPolyIntersectionPointBuckets &) = delete;
  RKMPolyIntersectionPointBuckets &operator=(const RKMPolyIntersectionPointBuckets &) = delete;
  ~RKMPolyIntersectionPointBuckets();

  /// The new size, which is the position of the stored point, or 0 when memory runs out.
  unsigned PushBack(const RKMPolyIntersectionPoint &point);
  unsigned Size() const { return m_size; }
  /// The point at position i (1 … Size()); out of range reads as an all-zero point.
  const RKMPolyIntersectionPoint &operator[](unsigned i) const;
  RKMPolyIntersectionPoint &operator[](unsigned i);

private:
  static constexpr unsigned kBlock = 32;
  RKMPolyIntersectionPoint **m_blocks = nullptr;
  unsigned m_blockCapacity = 0;
  unsigned m_size = 0;
  RKMPolyIntersectionPoint m_outOfRange;
};
