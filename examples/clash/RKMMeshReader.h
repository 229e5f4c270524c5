#pragma once

// Triangle mesh readers for the clash example: Wavefront OBJ, STL (ASCII and binary) and OFF.
// They stand apart from the library so that the example shows how a caller brings its own geometry in.

#include <array>
#include <functional>
#include <string>
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

/// Reads `path`, choosing the format by its extension (.obj, .stl or .off, in any letter case).
/// Polygons are fan-triangulated and identical STL vertices are merged so that the result is indexed.
/// On failure returns false, leaves `out` unchanged and sets `error` to a message that starts with the
/// path and, for text formats, the 1-based line ("bunny.obj:12: face index 40 out of range (1..37)").
/// `progress`, when set, is called now and then with the fraction done (0..1), and with 1 on success.
/// Never throws: running out of memory, or an exception thrown by `progress`, is reported as a failure.
bool ReadMesh(const std::string &path, Mesh &out, std::string &error, const std::function<void(double)> &progress = {});

/// Parses a mesh held in memory, e.g. one compiled into the program. `formatHint` is "obj", "stl" or
/// "off" (a leading dot and any letter case are accepted); STL data may be binary despite the name
/// `text`. `nameForMessages` stands in for the file name in error messages and gives `out.name`.
bool ReadMeshFromMemory(const std::string &text, const std::string &formatHint, const std::string &nameForMessages,
                        Mesh &out, std::string &error);
} // namespace rkmclash
