#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <cstddef>

class RKMPolyBVConstVisitor;

/// Abstract bounding volume. Volumes are created with new from the library's thread-safe pool and
/// deleted through the virtual destructor by their owner. A pool that runs dry makes new give null
/// (no constructor runs, nothing is thrown).
class RKM_EXPORT RKMPolyBoundingVolume
{
public:
  /// The kind of a volume; any other value is an unknown kind.
  enum TypeID
  {
    TypeAABB = 0,
    TypeSphere = 1,
    TypeOBB = 2,
    TypePlane = 3,
    TypeCylinder = 4
  };

  virtual ~RKMPolyBoundingVolume();
  /// Calls the visitor's VisitConcrete for this volume's kind and gives its result.
  virtual HRESULT Accept(RKMPolyBVConstVisitor &visitor) const = 0;
  virtual TypeID GetTypeID() const = 0;

  static void *operator new(std::size_t size) noexcept;
  static void operator delete(void *p) noexcept;

protected:
  RKMPolyBoundingVolume() = default;
  RKMPolyBoundingVolume(const RKMPolyBoundingVolume &) = default;
  RKMPolyBoundingVolume &operator=(const RKMPolyBoundingVolume &) = default;
};
