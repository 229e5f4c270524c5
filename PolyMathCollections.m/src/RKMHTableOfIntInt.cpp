// RKMHTableOfIntInt and RKMHTableOfIntIntIterator, the walk over its pairs that reads its table: both
// are declared in RKMHTableOfIntInt.h.
#include "RKMHTableOfIntInt.h"

#include <new>

namespace
{
struct Pair
{
  int a, b;
};

// a + b in unsigned arithmetic: the same value as the int sum wherever that does not overflow, and
// symmetric, so (a, b) and (b, a) share a bucket in the unordered table.
unsigned HashPair(const void *p)
{
  const Pair *q = static_cast<const Pair *>(p);
  return static_cast<unsigned>(q->a) + static_cast<unsigned>(q->b);
}

int CompareOrdered(const void *x, const void *y)
{
  const Pair *p = static_cast<const Pair *>(x), *q = static_cast<const Pair *>(y);
  return (p->a == q->a && p->b == q->b) ? 0 : 1;
}

int CompareUnordered(const void *x, const void *y)
{
  const Pair *p = static_cast<const Pair *>(x), *q = static_cast<const Pair *>(y);
  return ((p->a == q->a && p->b == q->b) || (p->a == q->b && p->b == q->a)) ? 0 : 1;
}

void FreeAll(RKMHashTable &table)
{
  RKMHashCodeIter it(table);
  while (void *p = it++)
    delete static_cast<Pair *>(p);
  table.RemoveAll();
}
}

RKMHTableOfIntInt::RKMHTableOfIntInt(int size, unsigned char ordered)
    : m_table(HashPair, ordered ? CompareOrdered : CompareUnordered, size), m_ordered(ordered ? 1 : 0)
{
}

RKMHTableOfIntInt::RKMHTableOfIntInt(const RKMHTableOfIntInt &other)
    : m_table(HashPair, other.m_ordered ? CompareOrdered : CompareUnordered, other.Size()),
      m_ordered(other.m_ordered)
{
  CopyFrom(other);
}

RKMHTableOfIntInt &RKMHTableOfIntInt::operator=(const RKMHTableOfIntInt &other)
{
  if (this == &other)
    return *this;
  FreeAll(m_table);
  m_ordered = other.m_ordered;
  m_table = RKMHashTable(HashPair, m_ordered ? CompareOrdered : CompareUnordered, other.Size());
  CopyFrom(other);
  return *this;
}

RKMHTableOfIntInt::~RKMHTableOfIntInt() { FreeAll(m_table); }

void RKMHTableOfIntInt::CopyFrom(const RKMHTableOfIntInt &other)
{
  RKMHashCodeIter it(other.m_table);
  while (const Pair *p = static_cast<const Pair *>(it++))
    Insert(p->a, p->b);
}

unsigned char RKMHTableOfIntInt::Insert(int a, int b)
{
  Pair *p = new (std::nothrow) Pair{a, b};
  if (!p)
    return 0;
  if (m_table.Insert(p) != S_OK)
  {
    delete p;
    return 0;
  }
  return 1;
}

unsigned char RKMHTableOfIntInt::Locate(int a, int b) const
{
  const Pair probe{a, b};
  return m_table.Locate(&probe) != nullptr;
}

unsigned char RKMHTableOfIntInt::Remove(int a, int b)
{
  const Pair probe{a, b};
  Pair *p = static_cast<Pair *>(m_table.Remove(&probe));
  delete p;
  return p != nullptr;
}

void RKMHTableOfIntInt::RemoveAll() { FreeAll(m_table); }

void RKMHTableOfIntInt::GetIndices(RKMRawCollint &firsts, RKMRawCollint &seconds) const
{
  RKMHashCodeIter it(m_table);
  while (const Pair *p = static_cast<const Pair *>(it++))
  {
    firsts.Append(p->a);
    seconds.Append(p->b);
  }
}

unsigned char RKMHTableOfIntInt::First(int &a, int &b) const
{
  RKMHashCodeIter it(m_table);
  const Pair *p = static_cast<const Pair *>(it++);
  if (!p)
    return 0;
  a = p->a;
  b = p->b;
  return 1;
}

RKMHTableOfIntIntIterator::RKMHTableOfIntIntIterator(const RKMHTableOfIntInt &table)
    : m_iter(table.m_table), m_current(nullptr)
{
  Beginning();
}

void RKMHTableOfIntIntIterator::Beginning()
{
  m_iter.Reset();
  m_current = m_iter++;
}

unsigned char RKMHTableOfIntIntIterator::GetCurrent(int &a, int &b) const
{
  if (!m_current)
    return 0;
  const Pair *p = static_cast<const Pair *>(m_current);
  a = p->a;
  b = p->b;
  return 1;
}

unsigned char RKMHTableOfIntIntIterator::GetNext(int &a, int &b)
{
  if (m_current)
    m_current = m_iter++;
  return GetCurrent(a, b);
}
