#pragma once

// The clash pipeline: the scene (meshes and their placements), the options and the report of the exact
// clash test, and the steps from reading the meshes to writing the curves and the picture.

#include <array>
#include <functional>
#include <string>
#include <vector>

#include "RKMBVHTreeBuilder.h"
#include "RKMMathTransformation.h"
#include "RKMMeshReader.h"

namespace rkmclash
{
/// A mesh placed in the scene by a rigid motion (rotation, then translation).
struct PlacedMesh
{
  Mesh mesh;
  RKMMathTransformation placement;
};

/// A mesh file to read and where to put its mesh.
struct MeshFile
{
  std::string path;
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
  /// How the hierarchies are built: flat, grid (linear time) or greedy.
  RKMBVHTreeBuilder::SpatialOptimization strategy = RKMBVHTreeBuilder::Basic;
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

// The functions that answer a bool throw nothing: they return false with a message, which starts with
// "out of memory" when memory ran out (or is empty, when even the message could not be made).

/// For programs: sets memory aside that the first failed allocation gets back (through the new
/// handler), so that running out is reported like any failure. Without it, an exception may find no
/// memory to be made in and end the process. False when even the reserve cannot be had.
bool ReserveMemoryForFailures() noexcept;

/// Reads the files and places each mesh as its file says; with no file, the built-in scene: the bunny
/// given as OBJ text against a turned and shifted copy of itself. At least two meshes are needed.
/// `readSeconds` is the time taken; `progress` hears of each file's reading.
bool LoadScene(const std::vector<MeshFile> &files, const char *builtInBunnyObj, std::vector<PlacedMesh> &meshes,
               double &readSeconds, std::string &error,
               const std::function<void(const std::string &path, double fraction)> &progress = {});

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

/// The files the report is written to: PREFIX_curves.obj and PREFIX.svg. A prefix that ends with a
/// slash, or names a directory, stands for the prefix "clash" in it.
struct OutputFiles
{
  std::string curves, picture;
};
OutputFiles OutputFilesFor(const std::string &prefix);

/// Writes the curves and the picture (seen along axis 0, 1 or 2), creating missing directories.
bool WriteOutputs(const OutputFiles &files, const std::vector<PlacedMesh> &meshes, const ClashReport &report, int axis,
                  std::string &error);

/// Writes the curves as OBJ polylines (one `l` per segment).
bool WriteCurvesObj(const std::string &path, const ClashReport &report, std::string &error);

/// Writes an SVG: the meshes' edges in light outline, seen along axis 0, 1 or 2, and the curves over
/// them in a strong colour.
bool WriteSvg(const std::string &path, const std::vector<PlacedMesh> &meshes, const ClashReport &report, int axis,
              std::string &error);
} // namespace rkmclash
