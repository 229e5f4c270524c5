#pragma once

#include "RKMExport.h"

/// One vertex of an intersection, described combinatorially on each of the two primitives of the
/// query (slot 0 the first, slot 1 the second): the feature type (0 undefined, 1 vertex, 2 bar,
/// 3 triangle interior), its index, and a caller's entity id that the intersectors never set.
/// Bar i of a triangle runs from vertex i to vertex (i + 1) mod 3; bar 0 of a segment is its interior.
/// A slot other than 0 or 1 reads as undefined and ignores writes.
class RKM_EXPORT RKMPolyIntersectionPoint
{
public:
  enum EntityType
  {
    Undefined = 0,
    Vertex = 1,
    Bar = 2,
    Triangle = 3
  };

  RKMPolyIntersectionPoint() = default;

  int GetEntity(int i) const { return Valid(i) ? entity[i] : 0; }
  int GetEntityType(int i) const { return Valid(i) ? entityType[i] : Undefined; }
  /// The vertex index when slot i is a vertex, else -1.
  int GetVertexIndex(int i) const { return Valid(i) && entityType[i] == Vertex ? index[i] : -1; }
  /// The bar index when slot i is a bar, else -1.
  int GetBarIndex(int i) const { return Valid(i) && entityType[i] == Bar ? index[i] : -1; }

  void SetEntities(int e0, int e1)
  {
    entity[0] = e0;
    entity[1] = e1;
  }
  void SetVertexIntersection(int i, int v) { Set(i, Vertex, v); }
  void SetBarIntersection(int i, int b) { Set(i, Bar, b); }
  void SetTriangleIntersection(int i) { Set(i, Triangle, 0); }
  /// Both slots' types and indices to 0; the entities are kept.
  void SetUndefinedIntersection()
  {
    entityType[0] = entityType[1] = Undefined;
    index[0] = index[1] = 0;
  }

  bool operator==(const RKMPolyIntersectionPoint &o) const
  {
    return entity[0] == o.entity[0] && entity[1] == o.entity[1] && entityType[0] == o.entityType[0] &&
           entityType[1] == o.entityType[1] && index[0] == o.index[0] && index[1] == o.index[1];
  }
  bool operator!=(const RKMPolyIntersectionPoint &o) const { return !(*this == o); }

  int entity[2] = {0, 0};
  int entityType[2] = {0, 0};
  int index[2] = {0, 0};

private:
  static bool Valid(int i) { return i == 0 || i == 1; }
  void Set(int i, int type, int idx)
  {
    if (!Valid(i))
      return;
    entityType[i] = type;
    index[i] = idx;
  }
};

// Callers store and exchange the records as six ints.
static_assert(sizeof(RKMPolyIntersectionPoint) == 6 * sizeof(int), "an intersection point is six ints");
