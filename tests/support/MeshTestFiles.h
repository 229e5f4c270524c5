#pragma once

// Mesh files for the clash suites: generators of binary STL and of PLY in its three encodings, small
// valid samples of every format, and the seeded damage that the readers must survive.

#include <array>
#include <cstdint>
#include <cstring>
#include <random>
#include <sstream>
#include <string>
#include <vector>

namespace meshtest
{
using Triangle = std::array<std::array<float, 3>, 3>;

inline void PutLE32(std::string &out, std::uint32_t v)
{
  for (int i = 0; i < 4; ++i)
    out += static_cast<char>((v >> (8 * i)) & 0xFF);
}

// A binary STL; `header` fills the 80-byte header, and the triangle count can be made to lie.
inline std::string BinaryStl(const std::vector<Triangle> &triangles, const std::string &header = "binary test",
                             long long declaredCount = -1)
{
  std::string out = header.substr(0, 80);
  out.resize(80, '\0');
  PutLE32(out,
          static_cast<std::uint32_t>(declaredCount < 0 ? static_cast<long long>(triangles.size()) : declaredCount));
  for (const Triangle &t : triangles)
  {
    out.append(12, '\0'); // the normal
    for (const auto &v : t)
      for (float c : v)
      {
        std::uint32_t bits;
        std::memcpy(&bits, &c, sizeof bits);
        PutLE32(out, bits);
      }
    out.append(2, '\0');
  }
  return out;
}

inline const std::vector<Triangle> kTwoTriangles = {Triangle{{{0.f, 0.f, 0.f}, {1.f, 0.f, 0.f}, {0.f, 1.f, 0.f}}},
                                                    Triangle{{{1.f, 0.f, 0.f}, {1.f, 1.f, 0.f}, {0.f, 1.f, 0.f}}}};

// "1.0", "1" and "1e0" are one number: the facets share an edge.
inline const std::string kAsciiStl = "solid square\n"
                                     "  facet normal 0 0 1\n    outer loop\n"
                                     "      vertex 0 0 0\n      vertex 1 0 0\n      vertex 0 1 0\n"
                                     "    endloop\n  endfacet\n"
                                     "  facet normal 0 0 1\n    outer loop\n"
                                     "      vertex 1.0 0 0\n      vertex 1 1 0\n      vertex 0 1e0 0\n"
                                     "    endloop\n  endfacet\n"
                                     "endsolid square\n";

// A quad (with texture and normal indices) and a triangle given by negative indices, among the lines
// the reader skips.
inline const std::string kObj = "# a unit quad and a triangle\nmtllib quad.mtl\no quad\n"
                                "v 0 0 0\nv 1 0 0\nv 1 1 0 1.0\nv 0 1 0\nvt 0 0\nvn 0 0 1\n"
                                "g group\nusemtl red\ns off\nf 1/1/1 2/1/1 3//1 4/1\n\nf -4 -3 -1\n";

inline const std::string kOff = "OFF\n# a cube\n8 6 12\n"
                                "0 0 0\n1 0 0\n1 1 0\n0 1 0\n0 0 1\n1 0 1\n1 1 1\n0 1 1\n"
                                "4 0 3 2 1\n4 4 5 6 7\n4 0 1 5 4\n4 1 2 6 5\n4 2 3 7 6\n4 3 0 4 7 255 0 0\n";

// A PLY file in one of the three encodings: "ply", the format line, `header`, "end_header", then one
// element instance per row, each value written as the PLY type it is tagged with.
using PlyRow = std::vector<std::pair<std::string, double>>;

inline std::string Ply(const std::string &format, const std::string &header, const std::vector<PlyRow> &rows)
{
  std::string out = "ply\nformat " + format + " 1.0\n" + header + "end_header\n";
  for (const PlyRow &row : rows)
  {
    for (const auto &[type, value] : row)
    {
      if (format == "ascii")
      {
        std::ostringstream text;
        text << value << ' ';
        out += text.str();
        continue;
      }
      std::uint64_t bits = 0;
      std::size_t size = type == "char" || type == "uchar" ? 1 : type == "short" || type == "ushort" ? 2 : 4;
      if (type == "float")
      {
        const float f = static_cast<float>(value);
        std::uint32_t narrow;
        std::memcpy(&narrow, &f, sizeof f);
        bits = narrow;
      }
      else if (type == "double")
        std::memcpy(&bits, &value, sizeof bits), size = 8;
      else
        bits = static_cast<std::uint64_t>(static_cast<std::int64_t>(value));
      for (std::size_t k = 0; k < size; ++k)
        out += static_cast<char>(bits >> (8 * (format == "binary_big_endian" ? size - 1 - k : k)));
    }
    if (format == "ascii")
      out += "\n";
  }
  return out;
}

// Every numeric type, both spellings, and what the mesh does not keep: other properties, lists and
// elements, comments and obj_info.
inline const std::string kPlyHeader =
    "comment made by hand\nobj_info a quad and a triangle\n"
    "element vertex 4\nproperty float x\nproperty float64 y\nproperty short z\n"
    "property uchar red\nelement edge 1\nproperty int vertex1\nproperty int32 vertex2\n"
    "element face 2\nproperty list uint8 uint32 vertex_index\n"
    "property list ushort float texcoord\nproperty char flags\n"
    "element material 1\nproperty double shininess\n";

inline const std::vector<PlyRow> kPlyRows = {
    {{"float", 0}, {"double", 0}, {"short", 0}, {"uchar", 255}},
    {{"float", 1}, {"double", 0}, {"short", 0}, {"uchar", 0}},
    {{"float", 1}, {"double", 1.5}, {"short", 0}, {"uchar", 0}},
    {{"float", 0.25}, {"double", 1}, {"short", -2}, {"uchar", 7}},
    {{"int", 0}, {"int", 1}},
    {{"uchar", 4},
     {"uint", 0},
     {"uint", 1},
     {"uint", 2},
     {"uint", 3},
     {"ushort", 2},
     {"float", 0.5},
     {"float", 0},
     {"char", -1}},
    {{"uchar", 3}, {"uint", 3}, {"uint", 1}, {"uint", 0}, {"ushort", 0}, {"char", 0}},
    {{"double", 0.5}}};

// One to three damages drawn from rng: a cut, random bytes, a piece inserted, erased or copied, a new
// binary triangle count (where the file is long enough to have one), a token's first byte.
inline std::string Damage(std::string bytes, std::mt19937 &rng)
{
  static const std::vector<std::string> pieces = {"0",           "-1",
                                                  "-0",          "nan",
                                                  "inf",         "1e400",
                                                  "99999999999", "4294967295",
                                                  "/",           "//",
                                                  " ",           "\n",
                                                  "\r",          "\r\n",
                                                  "#",           std::string(1, '\0'),
                                                  "f ",          "v ",
                                                  "facet",       "endsolid",
                                                  "OFF",         "\xFF\xFF\xFF\xFF",
                                                  "3 0 1 2\n"};
  const auto below = [&](std::size_t n)
  { return n == 0 ? 0 : std::uniform_int_distribution<std::size_t>(0, n - 1)(rng); };
  for (std::size_t m = 0, mutations = 1 + below(3); m < mutations; ++m)
  {
    switch (below(7))
    {
    case 0:
      bytes.resize(below(bytes.size() + 1));
      break;
    case 1:
      for (std::size_t k = 1 + below(8); k > 0 && !bytes.empty(); --k)
        bytes[below(bytes.size())] = static_cast<char>(below(256));
      break;
    case 2:
      bytes.insert(below(bytes.size() + 1), pieces[below(pieces.size())]);
      break;
    case 3:
      if (const std::size_t at = bytes.empty() ? 0 : below(bytes.size()); !bytes.empty())
        bytes.erase(at, 1 + below(16));
      break;
    case 4:
      if (const std::size_t at = bytes.empty() ? 0 : below(bytes.size()); !bytes.empty())
      {
        const std::string copy = bytes.substr(at, 1 + below(64));
        bytes.insert(below(bytes.size() + 1), copy);
      }
      break;
    case 5:
      if (std::string count; bytes.size() >= 84)
      {
        PutLE32(count, below(3) == 0 ? static_cast<std::uint32_t>(below(5)) : static_cast<std::uint32_t>(rng()));
        bytes.replace(80, 4, count);
      }
      break;
    default:
      if (!bytes.empty())
        bytes[below(bytes.size())] = pieces[below(pieces.size())][0];
    }
  }
  return bytes;
}
} // namespace meshtest
