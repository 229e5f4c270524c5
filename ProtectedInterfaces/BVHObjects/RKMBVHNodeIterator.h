#pragma once

#include "RKMExport.h"

class RKMBVHNode;

/// A source of nodes, implemented by callers (the builders consume it). Begin must restart it.
class RKM_EXPORT RKMBVHNodeIterator
{
public:
  virtual ~RKMBVHNodeIterator();
  virtual RKMBVHNodeIterator &Begin() = 0;
  /// True when exhausted.
  virtual unsigned char End() const = 0;
  virtual RKMBVHNodeIterator &operator++() = 0;
  /// The current node; may be null.
  virtual RKMBVHNode *operator*() const = 0;
};
