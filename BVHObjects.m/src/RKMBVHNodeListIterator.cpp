#include "RKMBVHNode.h"
#include "RKMBVHNodeListIterator.h"
#include "RKMListPtrRKMBVHNodeConst.h"

RKMBVHNodeIterator &RKMBVHNodeListIterator::Begin()
{
  m_position = 1;
  return *this;
}

unsigned char RKMBVHNodeListIterator::End() const { return m_position < 1 || m_position > m_count; }

RKMBVHNodeIterator &RKMBVHNodeListIterator::operator++()
{
  ++m_position;
  return *this;
}

RKMBVHNode *RKMBVHNodeListIterator::operator*() const
{
  return End() ? nullptr : static_cast<RKMBVHNode *>(m_list[m_position]);
}
