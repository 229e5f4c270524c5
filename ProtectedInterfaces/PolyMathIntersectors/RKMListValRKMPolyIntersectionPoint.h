#pragma once

#include "RKMExport.h"
#include "RKMPolyIntersectionPoint.h"
#include "RKMRawColl.h"

/// A list of intersection points, positions 1 … Size(), that owns a heap copy of each. A point that
/// cannot be copied for lack of memory is not stored, and the call reports it.
class RKM_EXPORT RKMListValRKMPolyIntersectionPoint
{
public:
  explicit RKMListValRKMPolyIntersectionPoint(int initialCapacity = 0);
  RKMListValRKMPolyIntersectionPoint(const RKMListValRKMPolyIntersectionPoint &other);
  RKMListValRKMPolyIntersectionPoint &operator=(const RKMListValRKMPolyIntersectionPoint &other);
  ~RKMListValRKMPolyIntersectionPoint();

  int Size() const { return m_points.Size(); }
  /// The new size, or 0 when memory runs out (nothing stored).
  int Append(const RKMPolyIntersectionPoint &point);
  /// Appends a copy of every point of the other list; the new size, or 0 when memory ran out (the
  /// list is then as it was).
  int Append(const RKMListValRKMPolyIntersectionPoint &other);
  /// Inserts before position pos (1 … Size() + 1); the new size, or 0 on a bad position or no memory.
  int InsertAt(int pos, const RKMPolyIntersectionPoint &point);
  /// The new size, or -1 on a bad position.
  int RemovePosition(int pos);
  void RemoveAll(RKMCollec mode = RKMCollecReleaseAllocatedMemory);
  /// The stored point; a position out of range reads as an all-zero point.
  const RKMPolyIntersectionPoint &operator[](int pos) const;
  /// Same size and equal points in the same order.
  bool operator==(const RKMListValRKMPolyIntersectionPoint &other) const;
  bool operator!=(const RKMListValRKMPolyIntersectionPoint &other) const { return !(*this == other); }

private:
  RKMRawCollPV m_points;
};
