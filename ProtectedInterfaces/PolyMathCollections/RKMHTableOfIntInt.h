#pragma once

#include "RKMExport.h"
#include "RKMHashTable.h"
#include "RKMRawColl.h"

/// Set of pairs of ints, ordered ((a, b) ≠ (b, a)) or unordered ((a, b) = (b, a)).
class RKM_EXPORT RKMHTableOfIntInt
{
public:
  RKMHTableOfIntInt(int size = 0, unsigned char ordered = 1);
  RKMHTableOfIntInt(const RKMHTableOfIntInt &other);
  RKMHTableOfIntInt &operator=(const RKMHTableOfIntInt &other);
  ~RKMHTableOfIntInt();

  /// True when added; false when an equal pair is present or memory runs out.
  unsigned char Insert(int a, int b);
  /// True when an equal pair is present.
  unsigned char Locate(int a, int b) const;
  /// True when an equal pair was present and is removed.
  unsigned char Remove(int a, int b);
  void RemoveAll();
  int Size() const { return m_table.Size(); }
  unsigned char IsOrdered() const { return m_ordered; }
  /// Appends the first and the second member of every pair, in the iteration order.
  void GetIndices(RKMRawCollint &firsts, RKMRawCollint &seconds) const;
  /// True and the first pair of the iteration order, false when empty.
  unsigned char First(int &a, int &b) const;

private:
  friend class RKMHTableOfIntIntIterator;
  void CopyFrom(const RKMHTableOfIntInt &other);

  RKMHashTable m_table;
  unsigned char m_ordered;
};

/// The same set of int pairs under its map name.
class RKM_EXPORT RKMMapOfIntInt : public RKMHTableOfIntInt
{
public:
  using RKMHTableOfIntInt::RKMHTableOfIntInt;
};

/// Walks the pairs of an RKMHTableOfIntInt; the table must not change meanwhile.
class RKM_EXPORT RKMHTableOfIntIntIterator
{
public:
  explicit RKMHTableOfIntIntIterator(const RKMHTableOfIntInt &table);
  /// Back to the first pair.
  void Beginning();
  /// True and the current pair, false at the end.
  unsigned char GetCurrent(int &a, int &b) const;
  /// Moves to the next pair: true and that pair, false at the end.
  unsigned char GetNext(int &a, int &b);

private:
  RKMHashCodeIter m_iter;
  const void *m_current;
};
