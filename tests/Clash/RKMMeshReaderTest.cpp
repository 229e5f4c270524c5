// The mesh readers' tests: good and damaged files of every format. Most are read from memory (the same
// parsers); what depends on the file itself (opening, the extension, progress while reading) from a
// folder of the test's own.

#include "RKMMeshReader.h"
#include "MeshTestFiles.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <limits>
#include <new>
#include <random>
#include <stdexcept>

namespace
{
namespace fs = std::filesystem;
using namespace meshtest;
using rkmclash::Mesh;
using Tris = std::vector<std::array<int, 3>>;
using Verts = std::vector<std::array<double, 3>>;

class RKMMeshReader : public ::testing::Test
{
protected:
  void SetUp() override
  {
    // Unique across processes, so that builds testing at once do not share it.
    m_dir = fs::temp_directory_path() / ("rkm_clash_" + std::to_string(std::random_device{}()) + "_" +
                                         ::testing::UnitTest::GetInstance()->current_test_info()->name());
    fs::remove_all(m_dir);
    fs::create_directories(m_dir);
  }
  void TearDown() override
  {
    std::error_code ec;
    fs::remove_all(m_dir, ec);
  }
  std::string Write(const std::string &name, const std::string &bytes) const
  {
    const std::string path = (m_dir / name).string();
    std::ofstream(path, std::ios::binary) << bytes;
    return path;
  }
  fs::path m_dir;
};

std::string Hint(const std::string &name) { return fs::path(name).extension().string(); }

// Whatever a successful read returns must be usable without further checks.
void ExpectWellFormed(const Mesh &mesh)
{
  ASSERT_FALSE(mesh.triangles.empty());
  for (const auto &t : mesh.triangles)
    for (int i : t)
      ASSERT_TRUE(i >= 0 && static_cast<std::size_t>(i) < mesh.vertices.size()) << i;
  for (const auto &v : mesh.vertices)
    for (double c : v)
      ASSERT_TRUE(std::isfinite(c));
}

// A read that must fail, with the promises made for every failure: false, a message starting with the
// name, and the output left as it was. Returns the message.
std::string FailWith(const std::string &name, const std::function<bool(Mesh &, std::string &)> &read)
{
  Mesh mesh{{{7.0, 8.0, 9.0}}, {{0, 0, 0}}, "untouched"};
  std::string error;
  EXPECT_FALSE(read(mesh, error));
  EXPECT_EQ(error.rfind(name, 0), 0u) << "message does not start with the name: " << error;
  EXPECT_TRUE(mesh.vertices.size() == 1 && mesh.triangles.size() == 1 && mesh.name == "untouched");
  return error;
}

std::string Fail(const std::string &name, const std::string &bytes)
{
  return FailWith(name,
                  [&](Mesh &m, std::string &e) { return rkmclash::ReadMeshFromMemory(bytes, Hint(name), name, m, e); });
}

std::string FailPath(const std::string &path)
{
  return FailWith(path, [&](Mesh &m, std::string &e) { return rkmclash::ReadMesh(path, m, e); });
}

#define EXPECT_CONTAINS(text, fragment) EXPECT_NE((text).find(fragment), std::string::npos) << (text)

// Bad files of one format, read as "t.<ext>": a fragment starting with ':' or ' ' must follow the name
// (so the line or byte is checked too); any other must appear somewhere in the message.
void ExpectFailures(const std::string &ext, const std::vector<std::pair<std::string, std::string>> &cases)
{
  const std::string name = "t." + ext;
  for (const auto &[bytes, fragment] : cases)
  {
    SCOPED_TRACE(fragment);
    const std::string error = Fail(name, bytes);
    EXPECT_CONTAINS(error, fragment[0] == ':' || fragment[0] == ' ' ? name + fragment : fragment);
  }
}

TEST_F(RKMMeshReader, ValidFilesOfEveryFormat)
{
  struct Good
  {
    std::string name, bytes;
    Tris triangles;
    Verts vertices; // empty: not checked
  };
  const Tris quad = {{0, 1, 2}, {0, 2, 3}, {3, 1, 0}}, square = {{0, 1, 2}, {1, 3, 2}}, one = {{0, 1, 2}};
  const Verts unitSquare = {{0, 0, 0}, {1, 0, 0}, {0, 1, 0}, {1, 1, 0}};
  const Verts plyQuad = {{0, 0, 0}, {1, 0, 0}, {1, 1.5, 0}, {0.25, 1, -2}};
  std::string plyIndices = kPlyHeader, plyCrlf;
  plyIndices.replace(plyIndices.find("uint8 uint32 vertex_index"), 25, "uchar int vertex_indices");
  for (const char c : Ply("ascii", plyIndices, kPlyRows))
    plyCrlf += c == '\n' ? std::string("\r\n") : std::string(1, c);
  const std::vector<Triangle> tenth = {Triangle{{{0.1f, 0.f, 0.f}, {1.f, 0.f, 0.f}, {0.f, 1.f, 0.f}}},
                                       Triangle{{{1.f, 0.f, 0.f}, {1.f, 1.f, 0.f}, {0.f, 1.f, -0.f}}}};
  const Good cases[] = {
      // OBJ: polygons fanned from their first corner, negative indices counting back from the vertices
      // so far, faces before their vertices, CRLF, lone CR and a byte order mark, numbers kept exactly.
      {"quad.obj", kObj, {{0, 1, 2}, {0, 2, 3}, {0, 1, 3}}, {{0, 0, 0}, {1, 0, 0}, {1, 1, 0}, {0, 1, 0}}},
      {"penta.obj",
       "v 0 0 0\nv 2 0 0\nv 3 1 0\nv 1 2 0\nv -1 1 0\nf 1 2 3 4 5\n",
       {{0, 1, 2}, {0, 2, 3}, {0, 3, 4}},
       {}},
      {"neg.obj",
       "v 0 0 0\nv 1 0 0\nv 0 1 0\nf -3 -2 -1\nv 0 0 1\nv 1 0 1\nf -5 -2/-1 -1//-2\n",
       {{0, 1, 2}, {0, 3, 4}},
       {}},
      {"forward.obj", "f 1 2 3\nv 0 0 0\nv 1 0 0\nv 0 1 0\n", one, {}},
      {"crlf.OBJ", "\xEF\xBB\xBFv 0 0 0\r\nv 1 0 0\r\nv 0 1 0\r\nf 1 2 3\r\n", one, {}},
      {"cr.Obj", "v 0 0 0\rv 1 0 0\rv 0 1 0\rf 1 2 3", one, {}},
      {"exact.obj",
       "v 1.301895 0.122622 2.550061\nv +2.5 -0 1e-3\nv 0.1 1E2 -7.25e+1\nf 1 2 3\n",
       one,
       {{1.301895, 0.122622, 2.550061}, {2.5, -0.0, 1e-3}, {0.1, 100.0, -72.5}}},
      // STL: equal coordinates welded (signed zeros too, neighbouring values not), CRLF, tabs, several
      // solids; binary kept as floats, also behind a header that starts with "solid".
      {"square.stl", kAsciiStl, square, unitSquare},
      {"zero.STL",
       "solid z\nfacet normal 0 0 0\nouter loop\nvertex 0 0 0\nvertex -0 0 0\nvertex 0.30000000000000004 0 0\n"
       "endloop\nendfacet\nfacet normal nan nan nan\nouter loop\nvertex 0.3 0 0\nvertex 0 -0.0 0\nvertex 0.1 0 0\n"
       "endloop\nendfacet\nendsolid z\n",
       {{0, 0, 1}, {2, 0, 3}},
       {{0, 0, 0}, {0.30000000000000004, 0, 0}, {0.3, 0, 0}, {0.1, 0, 0}}},
      {"two.stl",
       "solid a\r\n\tfacet normal 0 0 1\r\n\t\touter loop\r\n\t\t\tvertex 0 0 0\r\n\t\t\tvertex 1 0 0\r\n"
       "\t\t\tvertex 0 1 0\r\n\t\tendloop\r\n\tendfacet\r\nendsolid a\r\nsolid b\r\nfacet normal 0 0 1\r\n"
       "outer loop\r\nvertex 0 1 0\r\nvertex 1 0 0\r\nvertex 1 1 0\r\nendloop\r\nendfacet\r\nendsolid\r\n",
       {{0, 1, 2}, {2, 1, 3}},
       unitSquare},
      {"bin.stl", BinaryStl(tenth), square, {{0.1f, 0, 0}, {1, 0, 0}, {0, 1, 0}, {1, 1, 0}}},
      {"solidbin.stl", BinaryStl(kTwoTriangles, "solid exported by a CAD tool"), square, unitSquare},
      // Even with a header of text only, the zero normals and attributes give the records away.
      {"padded.stl", BinaryStl(kTwoTriangles, "solid" + std::string(75, ' ')), square, unitSquare},
      // OFF: comments, a face colour, the header's variants and counts on its line, polygons fanned.
      {"cube.off",
       kOff,
       {{0, 3, 2},
        {0, 2, 1},
        {4, 5, 6},
        {4, 6, 7},
        {0, 1, 5},
        {0, 5, 4},
        {1, 2, 6},
        {1, 6, 5},
        {2, 3, 7},
        {2, 7, 6},
        {3, 0, 4},
        {3, 4, 7}},
       {}},
      {"c.off", "COFF 3 1 0\n0 0 0 255 0 0 255\n1 0 0 0 255 0 255\n0 1 0 0 0 255 255\n3 0 1 2\n", one, {}},
      {"n.OFF", "NOFF\r\n3 1\r\n0 0 0 0 0 1\r\n1 0 0 0 0 1\r\n0 1 0 0 0 1\r\n3 2 1 0\r\n", {{2, 1, 0}}, {}},
      {"fan.off",
       "OFF\n5 1 0\n0 0 0\n2 0 0\n3 1 0\n1 2 0\n-1 1 0\n5 0 1 2 3 4\n",
       {{0, 1, 2}, {0, 2, 3}, {0, 3, 4}},
       {}},
      // PLY: the same mesh in its three encodings, and the index list's other name with CRLF.
      {"quad.ply", Ply("ascii", kPlyHeader, kPlyRows), quad, plyQuad},
      {"quad.ply", Ply("binary_little_endian", kPlyHeader, kPlyRows), quad, plyQuad},
      {"quad.ply", Ply("binary_big_endian", kPlyHeader, kPlyRows), quad, plyQuad},
      {"crlf.PLY", plyCrlf, quad, {}},
  };
  for (const Good &c : cases)
  {
    SCOPED_TRACE(c.name + " " + c.bytes.substr(0, 60));
    Mesh mesh;
    std::string error;
    ASSERT_TRUE(rkmclash::ReadMeshFromMemory(c.bytes, Hint(c.name), c.name, mesh, error)) << error;
    EXPECT_EQ(mesh.name, fs::path(c.name).stem().string());
    EXPECT_EQ(mesh.triangles, c.triangles);
    EXPECT_EQ(c.vertices.empty() ? c.vertices : mesh.vertices, c.vertices);
    ExpectWellFormed(mesh);
  }
}

TEST_F(RKMMeshReader, BunnyReadsWithProgressAndAsFromMemory)
{
  std::vector<double> fractions;
  Mesh mesh, fromMemory;
  std::string error;
  ASSERT_TRUE(rkmclash::ReadMesh(RKM_CLASH_BUNNY_PATH, mesh, error, [&](double f) { fractions.push_back(f); }))
      << error;
  EXPECT_EQ(mesh.name, "bunny");
  EXPECT_EQ(mesh.vertices.size(), 1839u);
  EXPECT_EQ(mesh.triangles.size(), 3674u);
  EXPECT_EQ(mesh.vertices[0], (std::array<double, 3>{1.301895, 0.122622, 2.550061}));
  ExpectWellFormed(mesh);
  // The file is larger than one progress step, so there is more than the closing report.
  ASSERT_GE(fractions.size(), 3u);
  EXPECT_TRUE(std::is_sorted(fractions.begin(), fractions.end()));
  EXPECT_TRUE(fractions.front() >= 0.0 && fractions.back() == 1.0);
  std::ifstream in(RKM_CLASH_BUNNY_PATH, std::ios::binary);
  const std::string text((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
  ASSERT_TRUE(rkmclash::ReadMeshFromMemory(text, "obj", "bunny.obj", fromMemory, error)) << error;
  EXPECT_EQ(fromMemory.name, "bunny");
  EXPECT_EQ(fromMemory.vertices, mesh.vertices);
  EXPECT_EQ(fromMemory.triangles, mesh.triangles);
}

TEST_F(RKMMeshReader, FilesThatCannotBeReadAndMemoryHints)
{
  EXPECT_CONTAINS(FailPath((m_dir / "absent.obj").string()), "cannot open file");
  fs::create_directories(m_dir / "folder.stl");
  EXPECT_CONTAINS(FailPath((m_dir / "folder.stl").string()), "is a directory");
  EXPECT_CONTAINS(FailPath(Write("mesh.3ds", "3ds\n")), "unknown mesh file extension '.3ds'");
  EXPECT_CONTAINS(FailPath(Write("mesh", "v 0 0 0\n")), "has no file extension");
  // A parse failure in a file names the whole path, then the line.
  const std::string path = Write("bunny.obj", "v 0 0 0\nv 1 0 0\n# comment\nv 0 1 0\nf 1 2 40\n");
  EXPECT_EQ(FailPath(path), path + ":5: face index 40 out of range (1..3)");

  Mesh mesh;
  std::string error;
  EXPECT_FALSE(rkmclash::ReadMeshFromMemory("v 0 0 0\nf 1 1 x\n", "OBJ", "embedded.obj", mesh, error));
  EXPECT_EQ(error, "embedded.obj:2: malformed face vertex 'x' (expected i, i/j, i//k or i/j/k)");
  EXPECT_CONTAINS(FailWith("embedded", [](Mesh &m, std::string &e)
                           { return rkmclash::ReadMeshFromMemory("v 0 0 0\n", "3ds", "embedded", m, e); }),
                  "embedded: unknown mesh format '3ds'");
  EXPECT_TRUE(rkmclash::ReadMeshFromMemory(BinaryStl(kTwoTriangles), ".stl", "memory.stl", mesh, error)) << error;
  EXPECT_EQ(mesh.triangles.size(), 2u);
}

TEST_F(RKMMeshReader, ProgressRunsThroughALargeFileAndItsFailuresBecomeErrors)
{
  std::string text;
  for (int i = 0; i < 20000; ++i)
    text += "v " + std::to_string(i) + " 0.5 -0.25\n";
  for (int i = 1; i + 2 <= 20000; ++i)
    text += "f " + std::to_string(i) + " " + std::to_string(i + 1) + " " + std::to_string(i + 2) + "\n";
  std::vector<double> fractions;
  Mesh mesh;
  std::string error;
  ASSERT_TRUE(rkmclash::ReadMesh(Write("big.obj", text), mesh, error, [&](double f) { fractions.push_back(f); }));
  EXPECT_EQ(mesh.triangles.size(), 19998u);
  // About 900 KB: a report per 64 KB read and per 64 KB parsed.
  EXPECT_GE(fractions.size(), 20u);
  EXPECT_TRUE(std::is_sorted(fractions.begin(), fractions.end()));
  EXPECT_TRUE(fractions.front() >= 0.0 && fractions.back() == 1.0);

  const std::string path = Write("p.obj", kObj);
  const auto failing = [&](const std::string &start, std::function<void()> thrower)
  {
    return FailWith(start, [&](Mesh &m, std::string &e)
                    { return rkmclash::ReadMesh(path, m, e, [&](double) { thrower(); }); });
  };
  EXPECT_EQ(failing(path, [] { throw std::runtime_error("cancelled"); }), path + ": cancelled");
  EXPECT_EQ(failing("out of memory", [] { throw std::bad_alloc(); }), "out of memory while reading " + path);
  EXPECT_CONTAINS(failing(path, [] { throw 42; }), "unexpected error");
}

TEST_F(RKMMeshReader, ObjFailuresNameTheLine)
{
  const std::string v3 = "v 0 0 0\nv 1 0 0\nv 0 1 0\n";
  std::vector<std::pair<std::string, std::string>> cases = {
      {"", "no triangles"},
      {v3 + "l 1 2\n", "no triangles"},
      {v3 + "f -1 -2 -4\n", ":4: face index -4 out of range (-3..-1)"},
      {"f -1 -2 -3\n", ":1: face index -1 out of range (no vertices defined)"},
      // A forward reference is judged once the whole file is known, but still at its own line.
      {"f 1 2 4\n" + v3, ":1: face index 4 out of range (1..3)"},
      {"v 0 0 0\nf 1 1 99999999999999999999\n", ":2: face index '99999999999999999999' is too large"},
      {"v 0 0 0\nf 1 1 9999999999\n", ":2: face index 9999999999 out of range"},
      {v3 + "f 0 1 2\n", ":4: face index 0 is invalid"},
      {"v 0 0 0\nv 1 0 0\nf 1 2\n", ":3: face with fewer than 3 vertices (2)"},
      {"v 0 0 0\nf\n", ":2: face with fewer than 3 vertices (0)"},
      // A comment ends the face early.
      {v3 + "f 1 2 #3\n", ":4: face with fewer than 3 vertices (2)"},
      {"v 0 0 0\nv 1 abc 3\n", ":2: malformed number 'abc'"},
      {"v 1,5 0 0\n", ":1: malformed number '1,5'"},
      {"v 1 2\n", ":1: vertex needs 3 coordinates, found 2"},
      {"v 1 2 3 4 5 6 7 8\n", ":1: vertex has 8 values"},
      {"v nan 0 0\n", ":1: coordinate 'nan' is not a finite number"},
      {"v 0 -inf 0\n", ":1: coordinate '-inf' is not a finite number"},
      {"v 0 0 0 NaN\n", ":1: coordinate 'NaN' is not a finite number"},
      {"v 1e999 0 0\n", ":1: number '1e999' is out of the range of a double"},
      {std::string("v 0 0 0\nv 1 0\0 0\n", 16), ":2: unexpected control character '\\x00'"},
  };
  for (const std::string face : {"1/2/3/4", "a", "1.5", "1//", "1/", "/1", "1/x/2", "--1", "+-1", "0x1"})
    cases.push_back({v3 + "f 1 2 " + face + "\n", ":4: malformed face vertex '" + face + "'"});
  ExpectFailures("obj", cases);
  // Long garbage tokens are cut short in the message.
  const std::string error = Fail("long.obj", "v " + std::string(5000, '9') + "x 0 0\n");
  EXPECT_CONTAINS(error, "...'");
  EXPECT_LT(error.size(), 200u);
}

TEST_F(RKMMeshReader, StlFailuresNameTheLineOrTheByte)
{
  const std::string head = "solid s\nfacet normal 0 0 1\nouter loop\nvertex 0 0 0\nvertex 1 0 0\n";
  // One stray byte in a long text file is damage to the text, not a sign of a binary file.
  std::string stray = kAsciiStl, cut = BinaryStl(kTwoTriangles);
  stray.insert(stray.find("vertex 1 0 0"), "\x01");
  cut.resize(cut.size() - 7);
  std::vector<Triangle> nan = kTwoTriangles, inf = kTwoTriangles;
  nan[1][2][1] = std::numeric_limits<float>::quiet_NaN();
  inf[1][2][1] = std::numeric_limits<float>::infinity();
  ExpectFailures(
      "stl",
      {{"", ": file is empty"},
       {"\n\n", "neither ASCII STL"},
       {"solid x\nendsolid x\n", "no triangles"},
       {head + "endloop\nendfacet\nendsolid\n", ":6: facet has 2 vertices"},
       {head + "vertex 0 1 0\nvertex 1 1 0\nendloop\n", ":7: facet has more than 3 vertices"},
       {head + "vertex 0 1 0\n", ":6: unexpected end of file inside a facet"},
       {head + "vertex 0 1 0\nendloop\nendfacet\n", ":8: unexpected end of file: missing 'endsolid'"},
       {head + "vertex 0 1 0\nendloop\nendface\n", ":8: expected 'endfacet', found 'endface'"},
       {head + "vertex 0 x1 0\n", ":6: malformed number 'x1'"},
       {head + "vertex 0 nan 0\n", ":6: coordinate 'nan' is not a finite number"},
       {head + "vertex 0 0\n", ":6: vertex needs 3 coordinates, found 2"},
       {"solid s\nfacet normal 0 0 one\n", ":2: malformed number 'one'"},
       {stray, ":5: unexpected control character '\\x01'"},
       {kAsciiStl + "junk\n", ":17: expected 'solid' or the end of the file, found 'junk'"},
       {cut, ": binary STL header count disagrees with the file size: 2 triangles need 184 bytes, but the file has "
             "177 (truncated file?)"},
       {BinaryStl(kTwoTriangles) + "trailing", "extra data"},
       {BinaryStl(kTwoTriangles) + "trailing", ": binary STL header count disagrees with the file size"},
       // The count is never trusted: four billion triangles in a small file are refused, not allocated.
       {BinaryStl(kTwoTriangles, "binary", 0xFFFFFFFFll),
        "4294967295 triangles need 214748364834 bytes, but the file has 184"},
       {BinaryStl(kTwoTriangles, "solid but binary", 3), ": binary STL header count disagrees with the file size"},
       {BinaryStl({}), ": no triangles"},
       {BinaryStl({}).substr(0, 60), ": neither ASCII STL"},
       {"solid x" + std::string(40, '\0'), ":1: unexpected control character"},
       {BinaryStl(nan), ": triangle 2 (byte offset 134): vertex 3 has a coordinate that is not a finite number"},
       {BinaryStl(inf), ": triangle 2 (byte offset 134): vertex 3 has a coordinate that is not a finite number"}});
}

TEST_F(RKMMeshReader, OffFailuresNameTheLine)
{
  const std::string head = "OFF\n3 1 0\n0 0 0\n1 0 0\n0 1 0\n";
  ExpectFailures(
      "off",
      {{"# nothing\n", "file is empty"},
       {"OFF\n3 0 0\n0 0 0\n1 0 0\n0 1 0\n", ":2: no triangles"},
       {"3 1 0\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n", ":1: expected the header 'OFF', found '3'"},
       {"4OFF\n", ":1: unsupported OFF variant '4OFF'"},
       {"OFF BINARY\n", ":1: binary OFF is not supported"},
       {"OFF\n# only a comment\n", ":2: file ends before the vertex"},
       {"OFF\n3\n", ":2: expected the counts"},
       {"OFF\n-3 1 0\n", ":2: malformed count '-3'"},
       {"OFF\n3 x 0\n", ":2: malformed count 'x'"},
       {"OFF\n2000000000 2000000000 0\n0 0 0\n", ":2: counts of 2000000000 vertices and 2000000000 faces cannot fit"},
       {"OFF\n99999999999999999999 1 0\n", ":2: malformed count"},
       {head + "3 0 1 3\n", ":6: face index 3 out of range (0..2)"},
       {head + "3 0 1 -1\n", ":6: face index -1 out of range (0..2)"},
       {head + "2 0 1\n", ":6: face with fewer than 3 vertices (2)"},
       {head + "4 0 1 2\n", ":6: face declares 4 vertices but lists only 3"},
       {head + "3 0 1 z\n", ":6: malformed face index 'z'"},
       {head + "three 0 1 2\n", ":6: malformed face vertex count 'three'"},
       {head, ":5: file ends after 0 of 1 faces"},
       {"OFF\n3 1 0\n0 0 0\n\n1 0 0\n", ":5: file ends after 2 of 3 vertices"},
       {"OFF\n3 1 0\n0 0 0\n1 0\n0 1 0\n3 0 1 2\n", ":4: vertex needs 3 coordinates, found 2"},
       {"OFF\n3 1 0\n0 0 0\n1 0 inf\n0 1 0\n3 0 1 2\n", ":4: coordinate 'inf' is not a finite number"},
       {"OFF\n0 1 0\n3 0 1 2\n", ":3: face index 0 out of range (no vertices"}});
}

TEST_F(RKMMeshReader, PlyFailuresNameTheLineOrTheByte)
{
  const std::string vertex = "element vertex 3\nproperty float x\nproperty float y\nproperty float z\n";
  const std::string face = "element face 1\nproperty list uchar int vertex_indices\n";
  const auto ascii = [](const std::string &h)
  { return "ply\nformat ascii 1.0\n" + h + "end_header\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n"; };
  const std::string head = "ply\nformat ascii 1.0\n" + vertex + "property uchar red\n" + face + "end_header\n";
  const std::string v3 = "0 0 0 1\n1 0 0 1\n0 1 0 1\n";
  std::vector<PlyRow> badIndex = kPlyRows, badCoordinate = kPlyRows;
  badIndex[6][3].second = 4;
  badCoordinate[1][0].second = std::numeric_limits<double>::infinity();
  ExpectFailures("ply", {{"", ": file is empty"},
                         {"solid x\n", ":1: not a PLY file"},
                         {"ply\nformat ascii 2.0\n", ":2: unsupported PLY version '2.0'"},
                         {"ply\nformat binary_middle_endian 1.0\n", ":2: unknown PLY format"},
                         {"ply\n" + vertex, ":2: expected the 'format' line, found 'element'"},
                         {"ply\nformat ascii 1.0\n" + vertex, ":6: file ends before 'end_header'"},
                         {ascii("property float x\n"), ":3: unexpected header line 'property' before"},
                         {ascii("elemnt vertex 3\n"), ":3: unexpected header line 'elemnt'"},
                         {ascii("element vertex -3\n"), ":3: malformed element count '-3'"},
                         {ascii("element vertex 99999999999999999999\n"), ":3: element count"},
                         {ascii("element vertex 3\nproperty float16 x\n"), ":4: unknown property type"},
                         {ascii(vertex + "element face 1\nproperty list float int vertex_indices\n"),
                          ":8: a list count needs an integer type"},
                         {ascii(vertex + "property float x\n" + face), ":7: element 'vertex' has a second"},
                         {ascii("element vertex 3\nproperty float x\nproperty float y\n" + face),
                          ":3: element 'vertex' has no property 'z'"},
                         {ascii(vertex + "element face 1\nproperty list uchar float vertex_indices\n"),
                          ":8: face property 'vertex_indices' must be a list of integers"},
                         {ascii(vertex + "element face 1\nproperty int flags\n"),
                          ":7: element 'face' has no 'vertex_indices' list"},
                         {ascii(vertex), ":7: no triangles"},
                         {ascii(vertex + "element face 0\nproperty list uchar int vertex_indices\n"),
                          ":7: no triangles: the file declares 0 faces"},
                         // Counts are checked against the bytes that follow before anything is allocated.
                         {ascii(vertex + "element face 4000000000\nproperty list uchar int vertex_indices\n"),
                          ":7: element 'face' declares 4000000000 items, more than"},
                         {head + v3 + "3 0 1 3\n", ":14: face index 3 out of range (0..2)"},
                         {head + v3 + "3 0 1 -1\n", ":14: face index -1 out of range"},
                         {head + v3 + "2 0 1\n", ":14: face with fewer than 3 vertices (2)"},
                         {head + v3 + "4 0 1 2\n", ":14: list 'vertex_indices' declares 4 values"},
                         {head + v3 + "3 0 1 2 7\n", ":14: the line has 5 values"},
                         {head + v3, ":13: file ends after 0 of 1 'face' elements"},
                         {head + "0 0 0\n" + v3 + "3 0 1 2\n", ":11: too few values"},
                         {head + "0 0 0 300\n", ":11: value '300' is out of the range of type 'uchar'"},
                         {head + "0 0 x 1\n", ":11: malformed number 'x'"},
                         {head + "0 nan 0 1\n", ":11: coordinate 'nan' is not a finite number"},
                         {Ply("binary_little_endian", kPlyHeader, badIndex),
                          ": face 2 (byte offset 499): face index 4 out of range (0..3)"},
                         {Ply("binary_big_endian", kPlyHeader, badCoordinate),
                          ": vertex 2 (byte offset 415): a coordinate is not a finite number"}});
  // Cut anywhere, the file never reads, and never reads out of bounds.
  const std::string whole = Ply("binary_little_endian", kPlyHeader, kPlyRows);
  for (std::size_t size = 0; size < whole.size(); ++size)
  {
    Mesh mesh;
    std::string error;
    ASSERT_FALSE(rkmclash::ReadMeshFromMemory(whole.substr(0, size), "ply", "cut.ply", mesh, error)) << size;
    ASSERT_EQ(error.rfind("cut.ply", 0), 0u) << error;
  }
}

// A number below the smallest subnormal reads as zero, as strtod reads it, in every text format; only a
// number above the largest double is refused. Near both ends of the range the reader agrees with strtod.
TEST_F(RKMMeshReader, UnderflowReadsAsTheNearestDoubleAndOverflowFails)
{
  for (const auto &[name, text] : std::vector<std::pair<std::string, std::string>>{
           {"t.obj", "v TINY\nv 1 0 0\nv 0 1 0\nf 1 2 3\n"},
           {"t.off", "OFF\n3 1 0\nTINY\n1 0 0\n0 1 0\n3 0 1 2\n"},
           {"t.stl", "solid s\nfacet normal 0 0 1e-999\nouter loop\nvertex TINY\nvertex 1 0 0\nvertex 0 1 0\n"
                     "endloop\nendfacet\nendsolid\n"},
           {"t.ply", "ply\nformat ascii 1.0\nelement vertex 3\nproperty double x\nproperty double y\n"
                     "property double z\nelement face 1\nproperty list uchar int vertex_indices\nend_header\n"
                     "TINY\n1 0 0\n0 1 0\n3 0 1 2\n"}})
  {
    std::string tiny = text, huge = text;
    tiny.replace(tiny.find("TINY"), 4, "1e-400 -0.000001e-318 2.5e-320");
    huge.replace(huge.find("TINY"), 4, "1 0 1e+309");
    Mesh mesh;
    std::string error;
    ASSERT_TRUE(rkmclash::ReadMeshFromMemory(tiny, Hint(name), name, mesh, error)) << error;
    EXPECT_EQ(mesh.vertices[0], (std::array<double, 3>{0.0, 0.0, std::strtod("2.5e-320", nullptr)})) << name;
    EXPECT_TRUE(std::signbit(mesh.vertices[0][1])) << name;
    EXPECT_CONTAINS(Fail(name, huge), "number '1e+309' is out of the range of a double");
  }
  std::mt19937 rng(20250301u);
  for (int i = 0; i < 3000; ++i)
  {
    const int exponent = std::uniform_int_distribution<int>(-345, -300)(rng) + (i % 2 ? 630 : 0);
    const std::string token = (rng() % 2 ? "-" : "") + std::to_string(rng() % 100000) + "." +
                              std::to_string(rng() % 1000) + "e" + std::to_string(exponent);
    const double expected = std::strtod(token.c_str(), nullptr);
    double value = 7.0;
    ASSERT_EQ(rkmclash::ParseFiniteNumber(token, value), std::isfinite(expected)) << token;
    ASSERT_TRUE(!std::isfinite(expected) || std::memcmp(&value, &expected, sizeof value) == 0) << token;
  }
  double value = 7.0;
  for (const char *bad : {"", "1e999", "inf", "nan", "0x1p3", "1,5", " 1", "1 ", "--1"})
    EXPECT_FALSE(rkmclash::ParseFiniteNumber(bad, value)) << bad;
  EXPECT_EQ(value, 7.0);
  EXPECT_TRUE(rkmclash::ParseFiniteNumber("0." + std::string(400, '0') + "1", value));
  EXPECT_EQ(value, 0.0);
}

// Valid files damaged by a fixed seed. Each read must come back, true with a well-formed mesh or false
// with a message naming the file; under a sanitizer this also shows that none reads out of bounds.
TEST_F(RKMMeshReader, DamagedFilesNeverCrash)
{
  const std::vector<std::pair<std::string, std::string>> samples = {
      {"sample.obj", kObj},
      {"sample.stl", kAsciiStl},
      {"sample.off", kOff},
      {"binary.stl", BinaryStl(kTwoTriangles)},
      {"solidbinary.stl", BinaryStl(kTwoTriangles, "solid but binary")},
      {"sample.ply", Ply("ascii", kPlyHeader, kPlyRows)},
      {"binary.ply", Ply("binary_big_endian", kPlyHeader, kPlyRows)}};
  std::mt19937 rng(20240611u);
  std::size_t accepted = 0, rejected = 0;
  for (int round = 0; round < 4000 && !HasFailure(); ++round)
  {
    const auto &[name, sample] = samples[static_cast<std::size_t>(round) % samples.size()];
    const std::string bytes = Damage(sample, rng);
    Mesh mesh;
    std::string error;
    // Most go through memory for speed; every tenth goes through a file to cover the file path too.
    const bool ok = round % 10 == 0 ? rkmclash::ReadMesh(Write(name, bytes), mesh, error,
                                                         [](double f) { ASSERT_TRUE(f >= 0.0 && f <= 1.0); })
                                    : rkmclash::ReadMeshFromMemory(bytes, Hint(name), name, mesh, error);
    accepted += ok, rejected += !ok;
    if (ok)
      ExpectWellFormed(mesh);
    else
      EXPECT_NE(error.find(name), std::string::npos) << error;
    if (HasFailure())
      ADD_FAILURE() << "round " << round << ", " << name << ", " << bytes.size() << " bytes";
  }
  // Both outcomes must occur, or the damage is too mild or too severe to test anything.
  EXPECT_GT(accepted, 100u);
  EXPECT_GT(rejected, 1000u);
  std::printf("[          ] %zu damaged files accepted, %zu rejected\n", accepted, rejected);
}
} // namespace
