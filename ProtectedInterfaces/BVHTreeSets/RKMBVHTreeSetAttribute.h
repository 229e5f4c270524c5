#pragma once

#include "RKMBVHAttribute.h"
#include "RKMExport.h"
#include "RKMMathTransformation.h"

#include <cstddef>

class RKMBVHTree;

/// The data a tree set attaches to the leaf of each object: the object's tree (one reference held),
/// its placement, its id and its activation. Allocated from the library's pool.
class RKM_EXPORT RKMBVHTreeSetAttribute : public RKMBVHAttribute
{
public:
  RKMBVHTreeSetAttribute() = default;
  RKMBVHTreeSetAttribute(const RKMBVHTreeSetAttribute &) = delete;
  RKMBVHTreeSetAttribute &operator=(const RKMBVHTreeSetAttribute &) = delete;
  /// Releases the object's tree.
  ~RKMBVHTreeSetAttribute() override;

  static void *operator new(std::size_t size) noexcept;
  static void operator delete(void *p) noexcept;

  RKMBVHTree *tree = nullptr;
  RKMMathTransformation position;
  int objectId = -1;
  /// Bit 0 set when the object is left out of the overall tree.
  int deactivated = 0;
};
