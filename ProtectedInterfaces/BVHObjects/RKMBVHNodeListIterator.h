#pragma once

#include "RKMBVHNodeIterator.h"
#include "RKMExport.h"

class RKMListPtrRKMBVHNodeConst;

/// Iterates the first count entries of a node list (positions 1 … count); outside them it is at its end
/// and gives null. The list is not owned.
class RKM_EXPORT RKMBVHNodeListIterator : public RKMBVHNodeIterator
{
public:
  RKMBVHNodeListIterator(const RKMListPtrRKMBVHNodeConst &list, int count) : m_list(list), m_count(count) {}
  RKMBVHNodeIterator &Begin() override;
  unsigned char End() const override;
  RKMBVHNodeIterator &operator++() override;
  RKMBVHNode *operator*() const override;

private:
  const RKMListPtrRKMBVHNodeConst &m_list;
  int m_position = 1;
  int m_count;
};
