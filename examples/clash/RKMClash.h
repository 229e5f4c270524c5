#pragma once

#include <array>
#include <functional>
#include <string>
#include <vector>

#include "RKMMathTransformation.h"

namespace rkmclash
{
/// A triangle mesh as the readers give it: vertices and 0-based vertex triples.
struct InputMesh
{
  std::vector<std::array<double, 3>> vertices;
  std::vector<std::array<int, 3>> triangles;
  std::string name;
};

/// A mesh placed in the scene by a rigid motion (rotation, then translation).
struct PlacedMesh
{
  InputMesh mesh;
  RKMMathTransformation placement;
};

enum class ContactKind
{
  /// The triangles pass through each other: their intersection segment has length and each
  /// triangle has vertices strictly on both sides of the other's plane.
  Crossing,
  /// They meet only on their boundaries: at a point, or along a segment on one's surface.
  Touching,
  /// They lie in one plane and overlap with positive area.
  CoplanarOverlap
};

struct TrianglePair
{
  int triangle[2];
  ContactKind kind;
};

/// A piece of an intersection curve, from the exact contact, in scene coordinates.
struct CurveSegment
{
  std::array<double, 3> from, to;
};

struct ObjectPairReport
{
  int object[2];
  long crossing = 0, touching = 0, coplanar = 0;
  std::vector<TrianglePair> pairs;
  std::vector<CurveSegment> curves;
};

struct ClashOptions
{
  /// Snap the placed coordinates to the grid of their box instead of deciding on them as they are.
  bool gridded = false;
  /// 0 flat, 1 grid (linear time), 2 greedy.
  int strategy = 1;
  /// Called now and then with a fraction done, for a progress line.
  std::function<void(const char *phase, double fraction)> progress;
};

struct ClashReport
{
  std::vector<ObjectPairReport> pairs;
  /// Placing (and snapping) the coordinates, building the hierarchies, walking them.
  double prepareSeconds = 0.0, buildSeconds = 0.0, walkSeconds = 0.0;
  long objectPairsTested = 0, trianglePairsTested = 0;
};

/// Finds every contact between triangles of different meshes, exactly. False with a message when the
/// input cannot be handled (no mesh, a triangle with a bad index, a coordinate that is not finite, or
/// coordinates that cannot be snapped in the gridded mode).
bool FindClashes(const std::vector<PlacedMesh> &meshes, const ClashOptions &options, ClashReport &report,
                 std::string &error);

/// Every pair of triangles of two meshes tested exactly, without any hierarchy: the reference the
/// hierarchy walk must agree with.
ObjectPairReport BruteForcePair(const std::vector<PlacedMesh> &meshes, int a, int b, bool gridded);

/// The placed coordinates of a mesh's vertices, as the clash test sees them.
std::vector<std::array<double, 3>> PlacedVertices(const PlacedMesh &mesh);

/// A rotation by the given angles in degrees about x, then y, then z, followed by a translation.
RKMMathTransformation MakePlacement(double tx, double ty, double tz, double rxDeg, double ryDeg, double rzDeg);

/// Writes the curves as OBJ polylines (one `l` per segment). False with a message on failure.
bool WriteCurvesObj(const std::string &path, const ClashReport &report, std::string &error);

/// Writes an SVG: the meshes' edges in light outline, seen along axis 0, 1 or 2, and the curves over
/// them in a strong colour.
bool WriteSvg(const std::string &path, const std::vector<PlacedMesh> &meshes, const ClashReport &report, int axis,
              std::string &error);
} // namespace rkmclash
