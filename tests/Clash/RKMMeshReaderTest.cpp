// The mesh readers' tests: good and damaged files of every format, with the generators that make them
// (binary STL, PLY in its three encodings) and a fixture that writes them to a folder of their own.

#include "RKMMeshReader.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cmath>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <limits>
#include <new>
#include <random>
#include <cstdlib>
#include <sstream>
#include <stdexcept>
#include <string>
#include <vector>

#ifdef _WIN32
#include <process.h>
#define RKM_TEST_PID _getpid()
#else
#include <unistd.h>
#define RKM_TEST_PID getpid()
#endif

namespace
{
namespace fs = std::filesystem;
using rkmclash::Mesh;
using Triangle = std::array<std::array<float, 3>, 3>;

// The build names the file; failing that, it is found beside this source, which CMake compiles by its
// absolute path.
std::string BunnyPath()
{
#if defined(RKM_CLASH_BUNNY_PATH)
  return RKM_CLASH_BUNNY_PATH;
#elif defined(RKM_CLASH_DATA_DIR)
  return std::string(RKM_CLASH_DATA_DIR) + "/bunny.obj";
#else
  return (fs::path(__FILE__).parent_path() / ".." / ".." / "examples" / "clash" / "data" / "bunny.obj").string();
#endif
}

void PutLE32(std::string &out, std::uint32_t v)
{
  for (int i = 0; i < 4; ++i)
    out += static_cast<char>((v >> (8 * i)) & 0xFF);
}

void PutFloat(std::string &out, float f)
{
  std::uint32_t bits;
  std::memcpy(&bits, &f, sizeof bits);
  PutLE32(out, bits);
}

// A binary STL; `header` fills the 80-byte header, and the triangle count can be made to lie.
std::string BinaryStl(const std::vector<Triangle> &triangles, const std::string &header = "binary test",
                      long long declaredCount = -1)
{
  std::string out = header.substr(0, 80);
  out.resize(80, '\0');
  PutLE32(out,
          declaredCount < 0 ? static_cast<std::uint32_t>(triangles.size()) : static_cast<std::uint32_t>(declaredCount));
  for (const Triangle &t : triangles)
  {
    for (int i = 0; i < 3; ++i)
      PutFloat(out, 0.0f);
    for (const auto &v : t)
      for (float c : v)
        PutFloat(out, c);
    out += std::string(2, '\0');
  }
  return out;
}

const std::vector<Triangle> kTwoTriangles = {
    Triangle{{{0.f, 0.f, 0.f}, {1.f, 0.f, 0.f}, {0.f, 1.f, 0.f}}},
    Triangle{{{1.f, 0.f, 0.f}, {1.f, 1.f, 0.f}, {0.f, 1.f, 0.f}}},
};

const char *const kAsciiStl = "solid square\n"
                              "  facet normal 0 0 1\n"
                              "    outer loop\n"
                              "      vertex 0 0 0\n"
                              "      vertex 1 0 0\n"
                              "      vertex 0 1 0\n"
                              "    endloop\n"
                              "  endfacet\n"
                              "  facet normal 0 0 1\n"
                              "    outer loop\n"
                              "      vertex 1.0 0 0\n"
                              "      vertex 1 1 0\n"
                              "      vertex 0 1e0 0\n"
                              "    endloop\n"
                              "  endfacet\n"
                              "endsolid square\n";

const char *const kObj = "# a unit quad and a triangle\n"
                         "mtllib quad.mtl\n"
                         "o quad\n"
                         "v 0 0 0\n"
                         "v 1 0 0\n"
                         "v 1 1 0 1.0\n"
                         "v 0 1 0\n"
                         "vt 0 0\n"
                         "vn 0 0 1\n"
                         "g group\n"
                         "usemtl red\n"
                         "s off\n"
                         "f 1/1/1 2/1/1 3//1 4/1\n"
                         "\n"
                         "f -4 -3 -1\n";

const char *const kOff = "OFF\n"
                         "# a cube\n"
                         "8 6 12\n"
                         "0 0 0\n1 0 0\n1 1 0\n0 1 0\n"
                         "0 0 1\n1 0 1\n1 1 1\n0 1 1\n"
                         "4 0 3 2 1\n4 4 5 6 7\n4 0 1 5 4\n"
                         "4 1 2 6 5\n4 2 3 7 6\n4 3 0 4 7 255 0 0\n";

// A PLY file in one of the three encodings: "ply", the format line, `header`, "end_header", then one
// element instance per row, each value written as the PLY type it is tagged with.
using PlyRow = std::vector<std::pair<std::string, double>>;

std::string Ply(const std::string &format, const std::string &header, const std::vector<PlyRow> &rows)
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
      if (type != "float" && type != "double")
        bits = static_cast<std::uint64_t>(static_cast<std::int64_t>(value));
      else if (type == "float")
      {
        const float f = static_cast<float>(value);
        std::uint32_t narrow;
        std::memcpy(&narrow, &f, sizeof f);
        bits = narrow;
      }
      else
      {
        std::memcpy(&bits, &value, sizeof bits);
        size = 8;
      }
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
const char *const kPlyHeader = "comment made by hand\n"
                               "obj_info a quad and a triangle\n"
                               "element vertex 4\n"
                               "property float x\n"
                               "property float64 y\n"
                               "property short z\n"
                               "property uchar red\n"
                               "element edge 1\n"
                               "property int vertex1\n"
                               "property int32 vertex2\n"
                               "element face 2\n"
                               "property list uint8 uint32 vertex_index\n"
                               "property list ushort float texcoord\n"
                               "property char flags\n"
                               "element material 1\n"
                               "property double shininess\n";

const std::vector<PlyRow> kPlyRows = {
    {{"float", 0}, {"double", 0}, {"short", 0}, {"uchar", 255}},
    {{"float", 1}, {"double", 0}, {"short", 0}, {"uchar", 0}},
    {{"float", 1}, {"double", 1.5}, {"short", 0}, {"uchar", 0}},
    {{"float", 0.25}, {"double", 1}, {"short", -2}, {"uchar", 7}},
    {{"int", 0}, {"int", 1}},
    {{"uchar", 4}, {"uint", 0}, {"uint", 1}, {"uint", 2}, {"uint", 3}, {"ushort", 2}, {"float", 0.5}, {"float", 0},
     {"char", -1}},
    {{"uchar", 3}, {"uint", 3}, {"uint", 1}, {"uint", 0}, {"ushort", 0}, {"char", 0}},
    {{"double", 0.5}}};

class RKMMeshReader : public ::testing::Test
{
protected:
  void SetUp() override
  {
    const auto *info = ::testing::UnitTest::GetInstance()->current_test_info();
    m_dir = fs::temp_directory_path() /
            ("rkm_clash_" + std::to_string(RKM_TEST_PID) + "_" + info->test_suite_name() + "_" + info->name());
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

  // Reads text that must load, failing the test with the reader's message if it does not.
  Mesh Load(const std::string &name, const std::string &bytes) const
  {
    Mesh mesh;
    std::string error;
    EXPECT_TRUE(rkmclash::ReadMesh(Write(name, bytes), mesh, error)) << error;
    return mesh;
  }

  // Reads a file that must fail, returning the message; checks the promises made for every failure:
  // false, a message naming the file, and the output left as it was.
  std::string Fail(const std::string &name, const std::string &bytes) const { return FailPath(Write(name, bytes)); }

  static std::string FailPath(const std::string &path)
  {
    Mesh mesh;
    mesh.vertices = {{7.0, 8.0, 9.0}};
    mesh.triangles = {{0, 0, 0}};
    mesh.name = "untouched";
    std::string error;
    EXPECT_FALSE(rkmclash::ReadMesh(path, mesh, error));
    EXPECT_EQ(error.rfind(path, 0), 0u) << "message does not start with the path: " << error;
    EXPECT_EQ(mesh.vertices.size(), 1u);
    EXPECT_EQ(mesh.triangles.size(), 1u);
    EXPECT_EQ(mesh.name, "untouched");
    return error;
  }

  std::string Path(const std::string &name) const { return (m_dir / name).string(); }

  fs::path m_dir;
};

void ExpectTriangles(const Mesh &mesh, const std::vector<std::array<int, 3>> &expected)
{
  ASSERT_EQ(mesh.triangles.size(), expected.size());
  for (std::size_t i = 0; i < expected.size(); ++i)
    EXPECT_EQ(mesh.triangles[i], expected[i]) << "triangle " << i;
}

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

#define EXPECT_CONTAINS(text, fragment) EXPECT_NE((text).find(fragment), std::string::npos) << (text)

// --- OBJ ---

TEST_F(RKMMeshReader, ObjReadsVerticesFacesAndSkipsEverythingElse)
{
  const Mesh mesh = Load("quad.obj", kObj);
  EXPECT_EQ(mesh.name, "quad");
  ASSERT_EQ(mesh.vertices.size(), 4u);
  EXPECT_EQ(mesh.vertices[2], (std::array<double, 3>{1.0, 1.0, 0.0}));
  // The quad is fanned from its first corner; -4 -3 -1 counts back from the 4 vertices defined so far.
  ExpectTriangles(mesh, {{0, 1, 2}, {0, 2, 3}, {0, 1, 3}});
}

TEST_F(RKMMeshReader, ObjFanTriangulatesPolygons)
{
  const Mesh mesh = Load("penta.obj", "v 0 0 0\nv 2 0 0\nv 3 1 0\nv 1 2 0\nv -1 1 0\nf 1 2 3 4 5\n");
  ExpectTriangles(mesh, {{0, 1, 2}, {0, 2, 3}, {0, 3, 4}});
}

TEST_F(RKMMeshReader, ObjNegativeIndicesCountBackFromTheVerticesSoFar)
{
  const Mesh mesh = Load("neg.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nf -3 -2 -1\n"
                                    "v 0 0 1\nv 1 0 1\nf -5 -2/-1 -1//-2\n");
  ExpectTriangles(mesh, {{0, 1, 2}, {0, 3, 4}});
}

TEST_F(RKMMeshReader, ObjAcceptsFacesBeforeTheirVertices)
{
  const Mesh mesh = Load("forward.obj", "f 1 2 3\nv 0 0 0\nv 1 0 0\nv 0 1 0\n");
  ExpectTriangles(mesh, {{0, 1, 2}});
}

TEST_F(RKMMeshReader, ObjToleratesCrLfLoneCrBomAndUppercaseExtension)
{
  const Mesh crlf = Load("crlf.OBJ", "\xEF\xBB\xBFv 0 0 0\r\nv 1 0 0\r\nv 0 1 0\r\nf 1 2 3\r\n");
  ExpectTriangles(crlf, {{0, 1, 2}});
  EXPECT_EQ(crlf.name, "crlf");
  const Mesh cr = Load("cr.Obj", "v 0 0 0\rv 1 0 0\rv 0 1 0\rf 1 2 3");
  ExpectTriangles(cr, {{0, 1, 2}});
}

TEST_F(RKMMeshReader, ObjKeepsNumbersExactly)
{
  const Mesh mesh = Load("exact.obj", "v 1.301895 0.122622 2.550061\nv +2.5 -0 1e-3\nv 0.1 1E2 -7.25e+1\nf 1 2 3\n");
  ASSERT_EQ(mesh.vertices.size(), 3u);
  EXPECT_EQ(mesh.vertices[0], (std::array<double, 3>{1.301895, 0.122622, 2.550061}));
  EXPECT_EQ(mesh.vertices[1], (std::array<double, 3>{2.5, -0.0, 1e-3}));
  EXPECT_EQ(mesh.vertices[2], (std::array<double, 3>{0.1, 100.0, -72.5}));
}

TEST_F(RKMMeshReader, BunnyHasTheTrianglesOfTheNpmPackage)
{
  std::vector<double> fractions;
  Mesh mesh;
  std::string error;
  const std::string path = BunnyPath();
  ASSERT_TRUE(rkmclash::ReadMesh(path, mesh, error, [&](double f) { fractions.push_back(f); })) << error;
  EXPECT_EQ(mesh.name, "bunny");
  EXPECT_EQ(mesh.vertices.size(), 1839u);
  EXPECT_EQ(mesh.triangles.size(), 3674u);
  EXPECT_EQ(mesh.vertices[0], (std::array<double, 3>{1.301895, 0.122622, 2.550061}));
  ExpectWellFormed(mesh);
  // The file is larger than one progress step, so there is more than the closing report.
  ASSERT_GE(fractions.size(), 3u);
  EXPECT_TRUE(std::is_sorted(fractions.begin(), fractions.end()));
  EXPECT_GE(fractions.front(), 0.0);
  EXPECT_EQ(fractions.back(), 1.0);

  // The same text compiled into a program gives the same mesh.
  std::ifstream in(path, std::ios::binary);
  std::stringstream text;
  text << in.rdbuf();
  Mesh fromMemory;
  ASSERT_TRUE(rkmclash::ReadMeshFromMemory(text.str(), "obj", "bunny.obj", fromMemory, error)) << error;
  EXPECT_EQ(fromMemory.name, "bunny");
  EXPECT_EQ(fromMemory.vertices, mesh.vertices);
  EXPECT_EQ(fromMemory.triangles, mesh.triangles);
}

// --- STL ---

TEST_F(RKMMeshReader, AsciiStlWeldsEqualCoordinates)
{
  // "1.0", "1" and "1e0" are one number, so the two facets share an edge: 4 vertices, not 6.
  const Mesh mesh = Load("square.stl", kAsciiStl);
  EXPECT_EQ(mesh.name, "square");
  ASSERT_EQ(mesh.vertices.size(), 4u);
  ExpectTriangles(mesh, {{0, 1, 2}, {1, 3, 2}});
  EXPECT_EQ(mesh.vertices[3], (std::array<double, 3>{1.0, 1.0, 0.0}));
}

TEST_F(RKMMeshReader, AsciiStlWeldsSignedZeroButNotNeighbouringValues)
{
  const Mesh mesh = Load("zero.STL", "solid z\nfacet normal 0 0 0\nouter loop\nvertex 0 0 0\nvertex -0 0 0\n"
                                     "vertex 0.30000000000000004 0 0\nendloop\nendfacet\n"
                                     "facet normal nan nan nan\nouter loop\nvertex 0.3 0 0\nvertex 0 -0.0 0\n"
                                     "vertex 0.1 0 0\nendloop\nendfacet\nendsolid z\n");
  ASSERT_EQ(mesh.vertices.size(), 4u);
  ExpectTriangles(mesh, {{0, 0, 1}, {2, 0, 3}});
}

TEST_F(RKMMeshReader, AsciiStlAcceptsCrLfTabsAndSeveralSolids)
{
  const Mesh mesh = Load("two.stl", "solid a\r\n\tfacet normal 0 0 1\r\n\t\touter loop\r\n\t\t\tvertex 0 0 0\r\n"
                                    "\t\t\tvertex 1 0 0\r\n\t\t\tvertex 0 1 0\r\n\t\tendloop\r\n\tendfacet\r\n"
                                    "endsolid a\r\nsolid b\r\nfacet normal 0 0 1\r\nouter loop\r\nvertex 0 1 0\r\n"
                                    "vertex 1 0 0\r\nvertex 1 1 0\r\nendloop\r\nendfacet\r\nendsolid\r\n");
  ASSERT_EQ(mesh.vertices.size(), 4u);
  ExpectTriangles(mesh, {{0, 1, 2}, {2, 1, 3}});
}

TEST_F(RKMMeshReader, BinaryStlWeldsAndKeepsFloatValues)
{
  const std::vector<Triangle> triangles = {Triangle{{{0.1f, 0.f, 0.f}, {1.f, 0.f, 0.f}, {0.f, 1.f, 0.f}}},
                                           Triangle{{{1.f, 0.f, 0.f}, {1.f, 1.f, 0.f}, {0.f, 1.f, -0.f}}}};
  const Mesh mesh = Load("bin.stl", BinaryStl(triangles));
  ASSERT_EQ(mesh.vertices.size(), 4u);
  ExpectTriangles(mesh, {{0, 1, 2}, {1, 3, 2}});
  EXPECT_EQ(mesh.vertices[0][0], static_cast<double>(0.1f));
}

TEST_F(RKMMeshReader, BinaryStlMayStartWithSolid)
{
  const Mesh mesh = Load("solidbin.stl", BinaryStl(kTwoTriangles, "solid exported by a CAD tool"));
  EXPECT_EQ(mesh.vertices.size(), 4u);
  EXPECT_EQ(mesh.triangles.size(), 2u);
  // Even with a header of text only, the zero normals and attributes give the records away.
  const Mesh padded = Load("padded.stl", BinaryStl(kTwoTriangles, "solid" + std::string(75, ' ')));
  EXPECT_EQ(padded.triangles.size(), 2u);
}

// --- OFF ---

TEST_F(RKMMeshReader, OffCubeWithCommentsAndFaceColour)
{
  const Mesh mesh = Load("cube.off", kOff);
  EXPECT_EQ(mesh.name, "cube");
  EXPECT_EQ(mesh.vertices.size(), 8u);
  ASSERT_EQ(mesh.triangles.size(), 12u);
  EXPECT_EQ(mesh.triangles[0], (std::array<int, 3>{0, 3, 2}));
  EXPECT_EQ(mesh.triangles[1], (std::array<int, 3>{0, 2, 1}));
  ExpectWellFormed(mesh);
}

TEST_F(RKMMeshReader, OffVariantsAndCountsOnTheHeaderLine)
{
  const Mesh coff = Load("c.off", "COFF 3 1 0\n0 0 0 255 0 0 255\n1 0 0 0 255 0 255\n0 1 0 0 0 255 255\n3 0 1 2\n");
  ExpectTriangles(coff, {{0, 1, 2}});
  const Mesh noff = Load("n.OFF", "NOFF\r\n3 1\r\n0 0 0 0 0 1\r\n1 0 0 0 0 1\r\n0 1 0 0 0 1\r\n3 2 1 0\r\n");
  ExpectTriangles(noff, {{2, 1, 0}});
  const Mesh fan = Load("fan.off", "OFF\n5 1 0\n0 0 0\n2 0 0\n3 1 0\n1 2 0\n-1 1 0\n5 0 1 2 3 4\n");
  ExpectTriangles(fan, {{0, 1, 2}, {0, 2, 3}, {0, 3, 4}});
}

// --- failures common to all formats ---

TEST_F(RKMMeshReader, MissingFileDirectoryAndUnknownExtension)
{
  EXPECT_CONTAINS(FailPath(Path("absent.obj")), "cannot open file");
  fs::create_directories(m_dir / "folder.stl");
  EXPECT_CONTAINS(FailPath(Path("folder.stl")), "is a directory");
  EXPECT_CONTAINS(Fail("mesh.3ds", "3ds\n"), "unknown mesh file extension '.3ds'");
  EXPECT_CONTAINS(Fail("mesh", "v 0 0 0\n"), "has no file extension");
}

TEST_F(RKMMeshReader, EmptyFilesAndFilesWithoutTriangles)
{
  EXPECT_CONTAINS(Fail("empty.obj", ""), "no triangles");
  EXPECT_CONTAINS(Fail("points.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nl 1 2\n"), "no triangles");
  EXPECT_CONTAINS(Fail("empty.stl", ""), "file is empty");
  EXPECT_CONTAINS(Fail("blank.stl", "\n\n"), "neither ASCII STL");
  EXPECT_CONTAINS(Fail("nofacets.stl", "solid x\nendsolid x\n"), "no triangles");
  EXPECT_CONTAINS(Fail("empty.off", "# nothing\n"), "file is empty");
  EXPECT_CONTAINS(Fail("nofaces.off", "OFF\n3 0 0\n0 0 0\n1 0 0\n0 1 0\n"), "nofaces.off:2: no triangles");
}

TEST_F(RKMMeshReader, MemoryReadsNameTheGivenNameAndCheckTheHint)
{
  Mesh mesh;
  std::string error;
  EXPECT_FALSE(rkmclash::ReadMeshFromMemory("v 0 0 0\nf 1 1 x\n", "OBJ", "embedded.obj", mesh, error));
  EXPECT_EQ(error, "embedded.obj:2: malformed face vertex 'x' (expected i, i/j, i//k or i/j/k)");
  EXPECT_FALSE(rkmclash::ReadMeshFromMemory("v 0 0 0\n", "3ds", "embedded", mesh, error));
  EXPECT_CONTAINS(error, "embedded: unknown mesh format '3ds'");
  EXPECT_TRUE(rkmclash::ReadMeshFromMemory(BinaryStl(kTwoTriangles), ".stl", "memory.stl", mesh, error)) << error;
  EXPECT_EQ(mesh.triangles.size(), 2u);
}

TEST_F(RKMMeshReader, ProgressCallbackFailuresBecomeErrors)
{
  const std::string path = Write("p.obj", kObj);
  Mesh mesh;
  std::string error;
  EXPECT_FALSE(rkmclash::ReadMesh(path, mesh, error, [](double) { throw std::runtime_error("cancelled"); }));
  EXPECT_EQ(error, path + ": cancelled");
  EXPECT_FALSE(rkmclash::ReadMesh(path, mesh, error, [](double) { throw std::bad_alloc(); }));
  EXPECT_EQ(error, "out of memory while reading " + path);
  EXPECT_FALSE(rkmclash::ReadMesh(path, mesh, error, [](double) { throw 42; }));
  EXPECT_CONTAINS(error, "unexpected error");
  EXPECT_TRUE(mesh.triangles.empty());
}

TEST_F(RKMMeshReader, ProgressIsReportedThroughALargeFile)
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
  EXPECT_GE(fractions.front(), 0.0);
  EXPECT_EQ(fractions.back(), 1.0);
}

// --- OBJ failures ---

TEST_F(RKMMeshReader, ObjIndexOutOfRangeNamesFileLineAndRange)
{
  const std::string path = Write("bunny.obj", "v 0 0 0\nv 1 0 0\n# comment\nv 0 1 0\nf 1 2 40\n");
  EXPECT_EQ(FailPath(path), path + ":5: face index 40 out of range (1..3)");
  EXPECT_CONTAINS(Fail("neg.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nf -1 -2 -4\n"),
                  "neg.obj:4: face index -4 out of range (-3..-1)");
  EXPECT_CONTAINS(Fail("novert.obj", "f -1 -2 -3\n"), "novert.obj:1: face index -1 out of range (no vertices defined)");
  // A forward reference is judged once the whole file is known, but still at its own line.
  EXPECT_CONTAINS(Fail("fwd.obj", "f 1 2 4\nv 0 0 0\nv 1 0 0\nv 0 1 0\n"),
                  "fwd.obj:1: face index 4 out of range (1..3)");
  EXPECT_CONTAINS(Fail("huge.obj", "v 0 0 0\nf 1 1 99999999999999999999\n"),
                  "huge.obj:2: face index '99999999999999999999' is too large");
  EXPECT_CONTAINS(Fail("big.obj", "v 0 0 0\nf 1 1 9999999999\n"), "big.obj:2: face index 9999999999 out of range");
}

TEST_F(RKMMeshReader, ObjZeroIndexAndShortFaces)
{
  EXPECT_CONTAINS(Fail("zero.obj", "v 0 0 0\nv 1 0 0\nv 0 1 0\nf 0 1 2\n"), "zero.obj:4: face index 0 is invalid");
  EXPECT_CONTAINS(Fail("two.obj", "v 0 0 0\nv 1 0 0\nf 1 2\n"), "two.obj:3: face with fewer than 3 vertices (2)");
  EXPECT_CONTAINS(Fail("none.obj", "v 0 0 0\nf\n"), "none.obj:2: face with fewer than 3 vertices (0)");
}

TEST_F(RKMMeshReader, ObjMalformedFaceVertices)
{
  const std::string vertices = "v 0 0 0\nv 1 0 0\nv 0 1 0\n";
  for (const std::string face : {"1/2/3/4", "a", "1.5", "1//", "1/", "/1", "1/x/2", "--1", "+-1", "0x1"})
    EXPECT_CONTAINS(Fail("face.obj", vertices + "f 1 2 " + face + "\n"),
                    "face.obj:4: malformed face vertex '" + face + "'");
  // A comment ends the face early.
  EXPECT_CONTAINS(Fail("comment.obj", vertices + "f 1 2 #3\n"), "comment.obj:4: face with fewer than 3 vertices (2)");
}

TEST_F(RKMMeshReader, ObjMalformedAndNonFiniteCoordinates)
{
  EXPECT_CONTAINS(Fail("abc.obj", "v 0 0 0\nv 1 abc 3\n"), "abc.obj:2: malformed number 'abc'");
  EXPECT_CONTAINS(Fail("comma.obj", "v 1,5 0 0\n"), "comma.obj:1: malformed number '1,5'");
  EXPECT_CONTAINS(Fail("short.obj", "v 1 2\n"), "short.obj:1: vertex needs 3 coordinates, found 2");
  EXPECT_CONTAINS(Fail("long.obj", "v 1 2 3 4 5 6 7 8\n"), "long.obj:1: vertex has 8 values");
  EXPECT_CONTAINS(Fail("nan.obj", "v nan 0 0\n"), "nan.obj:1: coordinate 'nan' is not a finite number");
  EXPECT_CONTAINS(Fail("inf.obj", "v 0 -inf 0\n"), "inf.obj:1: coordinate '-inf' is not a finite number");
  EXPECT_CONTAINS(Fail("w.obj", "v 0 0 0 NaN\n"), "w.obj:1: coordinate 'NaN' is not a finite number");
  EXPECT_CONTAINS(Fail("over.obj", "v 1e999 0 0\n"), "over.obj:1: number '1e999' is out of the range of a double");
}

TEST_F(RKMMeshReader, ObjBinaryGarbageIsNamedAsSuch)
{
  EXPECT_CONTAINS(Fail("bin.obj", std::string("v 0 0 0\nv 1 0\0 0\n", 16)),
                  "bin.obj:2: unexpected control character '\\x00'");
  // Long garbage tokens are cut short in the message.
  const std::string error = Fail("long.obj", "v " + std::string(5000, '9') + "x 0 0\n");
  EXPECT_CONTAINS(error, "...'");
  EXPECT_LT(error.size(), 200u);
}

// --- STL failures ---

TEST_F(RKMMeshReader, AsciiStlStructureErrorsNameTheLine)
{
  const std::string head = "solid s\nfacet normal 0 0 1\nouter loop\nvertex 0 0 0\nvertex 1 0 0\n";
  EXPECT_CONTAINS(Fail("two.stl", head + "endloop\nendfacet\nendsolid\n"), "two.stl:6: facet has 2 vertices");
  EXPECT_CONTAINS(Fail("four.stl", head + "vertex 0 1 0\nvertex 1 1 0\nendloop\n"),
                  "four.stl:7: facet has more than 3 vertices");
  EXPECT_CONTAINS(Fail("cut.stl", head + "vertex 0 1 0\n"), "cut.stl:6: unexpected end of file inside a facet");
  EXPECT_CONTAINS(Fail("noend.stl", head + "vertex 0 1 0\nendloop\nendfacet\n"),
                  "noend.stl:8: unexpected end of file: missing 'endsolid'");
  EXPECT_CONTAINS(Fail("word.stl", head + "vertex 0 1 0\nendloop\nendface\n"),
                  "word.stl:8: expected 'endfacet', found 'endface'");
  EXPECT_CONTAINS(Fail("num.stl", head + "vertex 0 x1 0\n"), "num.stl:6: malformed number 'x1'");
  EXPECT_CONTAINS(Fail("nan.stl", head + "vertex 0 nan 0\n"), "nan.stl:6: coordinate 'nan' is not a finite number");
  EXPECT_CONTAINS(Fail("vert.stl", head + "vertex 0 0\n"), "vert.stl:6: vertex needs 3 coordinates, found 2");
  EXPECT_CONTAINS(Fail("normal.stl", "solid s\nfacet normal 0 0 one\n"), "normal.stl:2: malformed number 'one'");
  // One stray byte in a long text file is damage to the text, not a sign of a binary file.
  std::string stray = kAsciiStl;
  stray.insert(stray.find("vertex 1 0 0"), "\x01");
  EXPECT_CONTAINS(Fail("stray.stl", stray), "stray.stl:5: unexpected control character '\\x01'");
  EXPECT_CONTAINS(Fail("after.stl", std::string(kAsciiStl) + "junk\n"),
                  "after.stl:17: expected 'solid' or the end of the file, found 'junk'");
}

TEST_F(RKMMeshReader, BinaryStlCountMustMatchTheFileSize)
{
  std::string truncated = BinaryStl(kTwoTriangles);
  truncated.resize(truncated.size() - 7);
  std::string error = Fail("cut.stl", truncated);
  EXPECT_CONTAINS(error, "cut.stl: binary STL header count disagrees with the file size: 2 triangles need 184 bytes, "
                         "but the file has 177 (truncated file?)");

  error = Fail("extra.stl", BinaryStl(kTwoTriangles) + "trailing");
  EXPECT_CONTAINS(error, "disagrees with the file size");
  EXPECT_CONTAINS(error, "extra data");

  // The count is never trusted: four billion triangles in a small file are refused, not allocated.
  error = Fail("absurd.stl", BinaryStl(kTwoTriangles, "binary", 0xFFFFFFFFll));
  EXPECT_CONTAINS(error, "4294967295 triangles need 214748364834 bytes, but the file has 184");

  error = Fail("solidcut.stl", BinaryStl(kTwoTriangles, "solid but binary", 3));
  EXPECT_CONTAINS(error, "solidcut.stl: binary STL header count disagrees with the file size");

  EXPECT_CONTAINS(Fail("zero.stl", BinaryStl({})), "zero.stl: no triangles");
  EXPECT_CONTAINS(Fail("header.stl", BinaryStl({}).substr(0, 60)), "header.stl: neither ASCII STL");
  EXPECT_CONTAINS(Fail("solidheader.stl", "solid x" + std::string(40, '\0')),
                  "solidheader.stl:1: unexpected control character");
}

TEST_F(RKMMeshReader, BinaryStlRejectsNonFiniteCoordinates)
{
  std::vector<Triangle> triangles = kTwoTriangles;
  triangles[1][2][1] = std::numeric_limits<float>::quiet_NaN();
  EXPECT_CONTAINS(Fail("nan.stl", BinaryStl(triangles)),
                  "nan.stl: triangle 2 (byte offset 134): vertex 3 has a coordinate that is not a finite number");
  triangles[1][2][1] = std::numeric_limits<float>::infinity();
  EXPECT_CONTAINS(Fail("inf.stl", BinaryStl(triangles)), "not a finite number");
}

// --- OFF failures ---

TEST_F(RKMMeshReader, OffHeaderAndCounts)
{
  EXPECT_CONTAINS(Fail("nohead.off", "3 1 0\n0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n"),
                  "nohead.off:1: expected the header 'OFF', found '3'");
  EXPECT_CONTAINS(Fail("four.off", "4OFF\n"), "four.off:1: unsupported OFF variant '4OFF'");
  EXPECT_CONTAINS(Fail("binary.off", "OFF BINARY\n"), "binary.off:1: binary OFF is not supported");
  EXPECT_CONTAINS(Fail("nocounts.off", "OFF\n# only a comment\n"), "nocounts.off:2: file ends before the vertex");
  EXPECT_CONTAINS(Fail("onecount.off", "OFF\n3\n"), "onecount.off:2: expected the counts");
  EXPECT_CONTAINS(Fail("negcount.off", "OFF\n-3 1 0\n"), "negcount.off:2: malformed count '-3'");
  EXPECT_CONTAINS(Fail("badcount.off", "OFF\n3 x 0\n"), "badcount.off:2: malformed count 'x'");
  EXPECT_CONTAINS(Fail("absurd.off", "OFF\n2000000000 2000000000 0\n0 0 0\n"),
                  "absurd.off:2: counts of 2000000000 vertices and 2000000000 faces cannot fit");
  EXPECT_CONTAINS(Fail("overflow.off", "OFF\n99999999999999999999 1 0\n"), "overflow.off:2: malformed count");
}

TEST_F(RKMMeshReader, OffVerticesAndFaces)
{
  const std::string head = "OFF\n3 1 0\n0 0 0\n1 0 0\n0 1 0\n";
  EXPECT_CONTAINS(Fail("range.off", head + "3 0 1 3\n"), "range.off:6: face index 3 out of range (0..2)");
  EXPECT_CONTAINS(Fail("negidx.off", head + "3 0 1 -1\n"), "negidx.off:6: face index -1 out of range (0..2)");
  EXPECT_CONTAINS(Fail("two.off", head + "2 0 1\n"), "two.off:6: face with fewer than 3 vertices (2)");
  EXPECT_CONTAINS(Fail("lists.off", head + "4 0 1 2\n"), "lists.off:6: face declares 4 vertices but lists only 3");
  EXPECT_CONTAINS(Fail("badidx.off", head + "3 0 1 z\n"), "badidx.off:6: malformed face index 'z'");
  EXPECT_CONTAINS(Fail("badn.off", head + "three 0 1 2\n"), "badn.off:6: malformed face vertex count 'three'");
  EXPECT_CONTAINS(Fail("nofaces.off", head), "nofaces.off:5: file ends after 0 of 1 faces");
  EXPECT_CONTAINS(Fail("fewverts.off", "OFF\n3 1 0\n0 0 0\n\n1 0 0\n"),
                  "fewverts.off:5: file ends after 2 of 3 vertices");
  EXPECT_CONTAINS(Fail("shortv.off", "OFF\n3 1 0\n0 0 0\n1 0\n0 1 0\n3 0 1 2\n"),
                  "shortv.off:4: vertex needs 3 coordinates, found 2");
  EXPECT_CONTAINS(Fail("inf.off", "OFF\n3 1 0\n0 0 0\n1 0 inf\n0 1 0\n3 0 1 2\n"),
                  "inf.off:4: coordinate 'inf' is not a finite number");
  EXPECT_CONTAINS(Fail("noverts.off", "OFF\n0 1 0\n3 0 1 2\n"),
                  "noverts.off:3: face index 0 out of range (no vertices");
}

// --- PLY ---

TEST_F(RKMMeshReader, PlyGivesTheSameMeshInItsThreeEncodings)
{
  for (const std::string format : {"ascii", "binary_little_endian", "binary_big_endian"})
  {
    SCOPED_TRACE(format);
    const Mesh mesh = Load("quad.ply", Ply(format, kPlyHeader, kPlyRows));
    EXPECT_EQ(mesh.name, "quad");
    EXPECT_EQ(mesh.vertices, (std::vector<std::array<double, 3>>{{0, 0, 0}, {1, 0, 0}, {1, 1.5, 0}, {0.25, 1, -2}}));
    ExpectTriangles(mesh, {{0, 1, 2}, {0, 2, 3}, {3, 1, 0}});
  }
  // The other name of the index list, in a text file with CRLF line ends.
  std::string header = kPlyHeader;
  header.replace(header.find("uint8 uint32 vertex_index"), 25, "uchar int vertex_indices");
  std::string text;
  for (const char c : Ply("ascii", header, kPlyRows))
    text += c == '\n' ? std::string("\r\n") : std::string(1, c);
  ExpectTriangles(Load("crlf.PLY", text), {{0, 1, 2}, {0, 2, 3}, {3, 1, 0}});
}

TEST_F(RKMMeshReader, PlyBadHeaders)
{
  const std::string vertex = "element vertex 3\nproperty float x\nproperty float y\nproperty float z\n";
  const std::string face = "element face 1\nproperty list uchar int vertex_indices\n";
  const std::string body = "0 0 0\n1 0 0\n0 1 0\n3 0 1 2\n";
  const auto ascii = [&](const std::string &h) { return "ply\nformat ascii 1.0\n" + h + "end_header\n" + body; };
  EXPECT_CONTAINS(Fail("a.ply", ""), "a.ply: file is empty");
  EXPECT_CONTAINS(Fail("a.ply", "solid x\n"), "a.ply:1: not a PLY file");
  EXPECT_CONTAINS(Fail("a.ply", "ply\nformat ascii 2.0\n"), "a.ply:2: unsupported PLY version '2.0'");
  EXPECT_CONTAINS(Fail("a.ply", "ply\nformat binary_middle_endian 1.0\n"), "a.ply:2: unknown PLY format");
  EXPECT_CONTAINS(Fail("a.ply", "ply\n" + vertex), "a.ply:2: expected the 'format' line, found 'element'");
  EXPECT_CONTAINS(Fail("a.ply", "ply\nformat ascii 1.0\n" + vertex), "a.ply:6: file ends before 'end_header'");
  EXPECT_CONTAINS(Fail("a.ply", ascii("property float x\n")), "a.ply:3: unexpected header line 'property' before");
  EXPECT_CONTAINS(Fail("a.ply", ascii("elemnt vertex 3\n")), "a.ply:3: unexpected header line 'elemnt'");
  EXPECT_CONTAINS(Fail("a.ply", ascii("element vertex -3\n")), "a.ply:3: malformed element count '-3'");
  EXPECT_CONTAINS(Fail("a.ply", ascii("element vertex 99999999999999999999\n")), "a.ply:3: element count");
  EXPECT_CONTAINS(Fail("a.ply", ascii("element vertex 3\nproperty float16 x\n")), "a.ply:4: unknown property type");
  EXPECT_CONTAINS(Fail("a.ply", ascii(vertex + "element face 1\nproperty list float int vertex_indices\n")),
                  "a.ply:8: a list count needs an integer type");
  EXPECT_CONTAINS(Fail("a.ply", ascii(vertex + "property float x\n" + face)), "a.ply:7: element 'vertex' has a second");
  EXPECT_CONTAINS(Fail("a.ply", ascii("element vertex 3\nproperty float x\nproperty float y\n" + face)),
                  "a.ply:3: element 'vertex' has no property 'z'");
  EXPECT_CONTAINS(Fail("a.ply", ascii(vertex + "element face 1\nproperty list uchar float vertex_indices\n")),
                  "a.ply:8: face property 'vertex_indices' must be a list of integers");
  EXPECT_CONTAINS(Fail("a.ply", ascii(vertex + "element face 1\nproperty int flags\n")),
                  "a.ply:7: element 'face' has no 'vertex_indices' list");
  EXPECT_CONTAINS(Fail("a.ply", ascii(vertex)), "a.ply:7: no triangles");
  EXPECT_CONTAINS(Fail("a.ply", ascii(vertex + "element face 0\nproperty list uchar int vertex_indices\n")),
                  "a.ply:7: no triangles: the file declares 0 faces");
  // Counts are checked against the bytes that follow before anything is allocated.
  std::string header = vertex + face;
  header.replace(header.find("face 1"), 6, "face 4000000000");
  EXPECT_CONTAINS(Fail("a.ply", ascii(header)), "a.ply:7: element 'face' declares 4000000000 items, more than");
}

TEST_F(RKMMeshReader, PlyBadBodiesNameTheLineOrTheByte)
{
  const std::string head = "ply\nformat ascii 1.0\nelement vertex 3\nproperty float x\nproperty float y\n"
                           "property float z\nproperty uchar red\nelement face 1\n"
                           "property list uchar int vertex_indices\nend_header\n";
  const std::string vertices = "0 0 0 1\n1 0 0 1\n0 1 0 1\n";
  EXPECT_CONTAINS(Fail("a.ply", head + vertices + "3 0 1 3\n"), "a.ply:14: face index 3 out of range (0..2)");
  EXPECT_CONTAINS(Fail("a.ply", head + vertices + "3 0 1 -1\n"), "a.ply:14: face index -1 out of range");
  EXPECT_CONTAINS(Fail("a.ply", head + vertices + "2 0 1\n"), "a.ply:14: face with fewer than 3 vertices (2)");
  EXPECT_CONTAINS(Fail("a.ply", head + vertices + "4 0 1 2\n"), "a.ply:14: list 'vertex_indices' declares 4 values");
  EXPECT_CONTAINS(Fail("a.ply", head + vertices + "3 0 1 2 7\n"), "a.ply:14: the line has 5 values");
  EXPECT_CONTAINS(Fail("a.ply", head + vertices), "a.ply:13: file ends after 0 of 1 'face' elements");
  EXPECT_CONTAINS(Fail("a.ply", head + "0 0 0\n" + vertices + "3 0 1 2\n"), "a.ply:11: too few values");
  EXPECT_CONTAINS(Fail("a.ply", head + "0 0 0 300\n"), "a.ply:11: value '300' is out of the range of type 'uchar'");
  EXPECT_CONTAINS(Fail("a.ply", head + "0 0 x 1\n"), "a.ply:11: malformed number 'x'");
  EXPECT_CONTAINS(Fail("a.ply", head + "0 nan 0 1\n"), "a.ply:11: coordinate 'nan' is not a finite number");

  std::vector<PlyRow> rows = kPlyRows;
  rows[6][3].second = 4;
  EXPECT_CONTAINS(Fail("a.ply", Ply("binary_little_endian", kPlyHeader, rows)),
                  "a.ply: face 2 (byte offset 499): face index 4 out of range (0..3)");
  rows = kPlyRows;
  rows[1][0].second = std::numeric_limits<double>::infinity();
  EXPECT_CONTAINS(Fail("a.ply", Ply("binary_big_endian", kPlyHeader, rows)),
                  "a.ply: vertex 2 (byte offset 415): a coordinate is not a finite number");
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

// --- numbers ---

// A number below the smallest subnormal reads as zero, as strtod reads it, in every text format and in
// --place; only a number above the largest double is refused.
TEST_F(RKMMeshReader, UnderflowReadsAsTheNearestDoubleAndOverflowFails)
{
  const std::string ply = "ply\nformat ascii 1.0\nelement vertex 3\nproperty double x\nproperty double y\n"
                          "property double z\nelement face 1\nproperty list uchar int vertex_indices\nend_header\n"
                          "TINY\n1 0 0\n0 1 0\n3 0 1 2\n";
  const std::string stl = "solid s\nfacet normal 0 0 1e-999\nouter loop\nvertex TINY\nvertex 1 0 0\nvertex 0 1 0\n"
                          "endloop\nendfacet\nendsolid\n";
  const std::vector<std::pair<std::string, std::string>> files = {
      {"t.obj", "v TINY\nv 1 0 0\nv 0 1 0\nf 1 2 3\n"},
      {"t.off", "OFF\n3 1 0\nTINY\n1 0 0\n0 1 0\n3 0 1 2\n"},
      {"t.stl", stl},
      {"t.ply", ply}};
  for (const auto &[name, text] : files)
  {
    std::string tiny = text, huge = text;
    tiny.replace(tiny.find("TINY"), 4, "1e-400 -0.000001e-318 2.5e-320");
    huge.replace(huge.find("TINY"), 4, "1 0 1e+309");
    const Mesh mesh = Load(name, tiny);
    ASSERT_FALSE(mesh.vertices.empty()) << name;
    EXPECT_EQ(mesh.vertices[0], (std::array<double, 3>{0.0, 0.0, std::strtod("2.5e-320", nullptr)})) << name;
    EXPECT_TRUE(std::signbit(mesh.vertices[0][1])) << name;
    EXPECT_CONTAINS(Fail(name, huge), "number '1e+309' is out of the range of a double");
  }

  // Near both ends of the range the reader agrees with strtod, bit for bit.
  std::mt19937 rng(20250301u);
  for (int i = 0; i < 3000; ++i)
  {
    const int exponent = std::uniform_int_distribution<int>(-345, -300)(rng) + (i % 2 ? 630 : 0);
    const std::string token = (rng() % 2 ? "-" : "") + std::to_string(rng() % 100000) + "." +
                              std::to_string(rng() % 1000) + "e" + std::to_string(exponent);
    const double expected = std::strtod(token.c_str(), nullptr);
    double value = 7.0;
    ASSERT_EQ(rkmclash::ParseFiniteNumber(token, value), std::isfinite(expected)) << token;
    if (std::isfinite(expected))
    {
      ASSERT_EQ(std::memcmp(&value, &expected, sizeof value), 0) << token;
    }
  }
  double value = 7.0;
  for (const char *bad : {"", "1e999", "inf", "nan", "0x1p3", "1,5", " 1", "1 ", "--1"})
    EXPECT_FALSE(rkmclash::ParseFiniteNumber(bad, value)) << bad;
  EXPECT_EQ(value, 7.0);
  EXPECT_TRUE(rkmclash::ParseFiniteNumber("0." + std::string(400, '0') + "1", value));
  EXPECT_EQ(value, 0.0);
}

// --- robustness ---

// Damages valid files in every way a fixed seed can think of. Each read must come back, true or false;
// under a sanitizer this also shows that no damaged input reads out of bounds.
TEST_F(RKMMeshReader, DamagedFilesNeverCrash)
{
  struct Sample
  {
    std::string name;
    std::string bytes;
  };
  const std::vector<Sample> samples = {
      {"sample.obj", kObj},
      {"sample.stl", kAsciiStl},
      {"sample.off", kOff},
      {"binary.stl", BinaryStl(kTwoTriangles)},
      {"solidbinary.stl", BinaryStl(kTwoTriangles, "solid but binary")},
      {"sample.ply", Ply("ascii", kPlyHeader, kPlyRows)},
      {"binary.ply", Ply("binary_big_endian", kPlyHeader, kPlyRows)},
  };
  const std::vector<std::string> pieces = {"0",           "-1",
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
  std::mt19937 rng(20240611u);
  const auto below = [&](std::size_t n)
  { return n == 0 ? 0 : std::uniform_int_distribution<std::size_t>(0, n - 1)(rng); };
  std::size_t accepted = 0;
  std::size_t rejected = 0;
  for (int round = 0; round < 4000; ++round)
  {
    const Sample &sample = samples[static_cast<std::size_t>(round) % samples.size()];
    std::string bytes = sample.bytes;
    const std::size_t mutations = 1 + below(3);
    for (std::size_t m = 0; m < mutations; ++m)
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
        if (!bytes.empty())
        {
          const std::size_t at = below(bytes.size());
          bytes.erase(at, 1 + below(16));
        }
        break;
      case 4:
        if (!bytes.empty())
        {
          const std::size_t at = below(bytes.size());
          const std::string copy = bytes.substr(at, 1 + below(64));
          bytes.insert(below(bytes.size() + 1), copy);
        }
        break;
      case 5:
        // The binary triangle count, where the file has one.
        if (bytes.size() >= 84)
        {
          std::string count;
          PutLE32(count, below(3) == 0 ? static_cast<std::uint32_t>(below(5)) : static_cast<std::uint32_t>(rng()));
          bytes.replace(80, 4, count);
        }
        break;
      default:
        if (!bytes.empty())
          bytes[below(bytes.size())] = pieces[below(pieces.size())][0];
        break;
      }
    }
    Mesh mesh;
    std::string error;
    bool ok;
    // Most go through memory for speed; every tenth goes through a file to cover the file path too.
    if (round % 10 == 0)
      ok = rkmclash::ReadMesh(Write(sample.name, bytes), mesh, error,
                              [](double f) { ASSERT_TRUE(f >= 0.0 && f <= 1.0); });
    else
      ok = rkmclash::ReadMeshFromMemory(bytes, fs::path(sample.name).extension().string(), sample.name, mesh, error);
    if (ok)
    {
      ++accepted;
      ExpectWellFormed(mesh);
    }
    else
    {
      ++rejected;
      EXPECT_NE(error.find(sample.name), std::string::npos) << error;
    }
    if (HasFailure())
    {
      ADD_FAILURE() << "round " << round << ", " << sample.name << ", " << bytes.size() << " bytes";
      break;
    }
  }
  // Both outcomes must occur, or the damage is too mild or too severe to test anything.
  EXPECT_GT(accepted, 100u);
  EXPECT_GT(rejected, 1000u);
  std::printf("[          ] %zu damaged files accepted, %zu rejected\n", accepted, rejected);
}
} // namespace
