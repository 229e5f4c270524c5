#pragma once

// Triangle mesh readers for the clash example: Wavefront OBJ, STL (ASCII and binary), OFF and PLY
// (ASCII and binary of either byte order). They stand apart from the library so that the example shows
// how a caller brings its own geometry in.

#include <array>
#include <functional>
#include <string>
#include <string_view>
#include <vector>

namespace rkmclash
{
/// An indexed triangle mesh. Triangle entries are 0-based indices into `vertices`.
struct Mesh
{
  std::vector<std::array<double, 3>> vertices;
  std::vector<std::array<int, 3>> triangles;
  /// The file name without directory and extension, e.g. "bunny" for "data/bunny.obj".
  std::string name;
};

/// Reads `path`, choosing the format by its extension (.obj, .stl, .off or .ply, in any letter case).
/// Polygons are fan-triangulated and identical STL vertices are merged so that the result is indexed.
/// On failure returns false, leaves `out` unchanged and sets `error` to a message that starts with the
/// path and, for text, the 1-based line ("bunny.obj:12: face index 40 out of range (1..37)"); binary
/// data is placed by a byte offset instead. Running out of memory gives "out of memory while reading"
/// and the path. `progress`, when set, is called now and then with the fraction done (0..1), and with 1
/// on success. Never throws: an exception thrown by `progress` is reported as a failure too.
bool ReadMesh(const std::string &path, Mesh &out, std::string &error, const std::function<void(double)> &progress = {});

/// Parses a mesh held in memory, e.g. one compiled into the program. `formatHint` is "obj", "stl", "off"
/// or "ply" (a leading dot and any letter case are accepted); STL and PLY data may be binary despite
/// the name `text`. `nameForMessages` stands in for the file name in error messages and gives
/// `out.name`.
bool ReadMeshFromMemory(const std::string &text, const std::string &formatHint, const std::string &nameForMessages,
                        Mesh &out, std::string &error);

/// A whole token read as the readers read coordinates: decimal, independent of the locale, with an
/// optional leading '+'. A value too small for a double reads as the nearest one (zero or a subnormal),
/// as strtod gives it; false for anything else, including a value too large for a double, inf and nan.
bool ParseFiniteNumber(std::string_view token, double &value);
} // namespace rkmclash
