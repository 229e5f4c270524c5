// Exact clash detection between triangle meshes: reads two or more meshes (OBJ, STL, OFF, PLY), places
// each by an optional rigid motion, and reports for every pair of meshes the triangle pairs that
// cross, that only touch, and that overlap in a common plane, with the intersection curves written
// as OBJ polylines and an SVG picture. With no argument it runs on a built-in scene: a bunny against
// a turned and shifted copy of itself. This file parses the arguments and prints; the pipeline is the
// clash core's.

#include <cstdio>
#include <new>
#include <string>
#include <unistd.h>
#include <vector>

#include "RKMClash.h"
#include "RKMMeshReader.h"

extern const char *const kEmbeddedBunnyObj;

namespace
{
using namespace rkmclash;

void Usage(FILE *to)
{
  std::fprintf(to,
               "usage: rkm_clash [options] [mesh [--place tx ty tz rx ry rz]]...\n"
               "  Reports the exact contacts between every two of the meshes (OBJ, STL, OFF or PLY).\n"
               "  --place tx ty tz rx ry rz  moves the mesh before it: rotations in degrees about x, y, z,\n"
               "                             then the translation\n"
               "  --gridded                  decide on coordinates snapped to a common grid (default:\n"
               "                             on the placed coordinates as they are)\n"
               "  --strategy flat|grid|greedy  how the hierarchies are built (default grid)\n"
               "  --view x|y|z               the axis the picture is seen along (default z)\n"
               "  --out PREFIX               output files PREFIX_curves.obj and PREFIX.svg; PREFIX may\n"
               "                             have folders, made when missing, and a folder alone (ending\n"
               "                             with /) means PREFIX/clash (default: clash, in the current\n"
               "                             folder)\n"
               "With no mesh, a built-in bunny is tested against a turned and shifted copy of itself.\n");
}

// One line on the terminal that keeps being rewritten; nothing when the output is not a terminal.
class ProgressLine
{
public:
  ProgressLine() : m_active(isatty(2) != 0) {}
  void Show(const std::string &what, double fraction)
  {
    if (!m_active)
      return;
    std::fprintf(stderr, "\r%-60s %3d%%", what.c_str(), static_cast<int>(fraction * 100.0 + 0.5));
    std::fflush(stderr);
    m_shown = true;
  }
  void Clear()
  {
    if (m_shown)
      std::fprintf(stderr, "\r%-66s\r", "");
    m_shown = false;
  }

private:
  bool m_active;
  bool m_shown = false;
};

int Fail(const std::string &error)
{
  std::fprintf(stderr, "rkm_clash: %s\n", error.empty() ? "out of memory" : error.c_str());
  return 1;
}

int Run(int argc, char **argv)
{
  ClashOptions options;
  int view = 2;
  std::string prefix = "clash";
  std::vector<MeshFile> files;
  for (int i = 1; i < argc; ++i)
  {
    const std::string arg = argv[i];
    if (arg == "--help" || arg == "-h")
    {
      Usage(stdout);
      return 0;
    }
    if (arg == "--gridded")
      options.gridded = true;
    else if (arg == "--strategy" && i + 1 < argc)
    {
      const std::string s = argv[++i];
      if (s == "flat")
        options.strategy = RKMBVHTreeBuilder::NoOptim;
      else if (s == "grid")
        options.strategy = RKMBVHTreeBuilder::Basic;
      else if (s == "greedy")
        options.strategy = RKMBVHTreeBuilder::Best;
      else
        return Fail("unknown strategy '" + s + "'");
    }
    else if (arg == "--view" && i + 1 < argc)
    {
      const std::string s = argv[++i];
      if (s != "x" && s != "y" && s != "z")
        return Fail("--view takes x, y or z");
      view = s[0] - 'x';
    }
    else if (arg == "--out" && i + 1 < argc)
      prefix = argv[++i];
    else if (arg == "--place")
    {
      double v[6];
      if (files.empty() || i + 6 >= argc)
        return Fail("--place follows a mesh and takes six numbers");
      for (int k = 0; k < 6; ++k)
        if (!ParseFiniteNumber(argv[i + 1 + k], v[k]))
          return Fail("--place: '" + std::string(argv[i + 1 + k]) + "' is not a number");
      i += 6;
      files.back().placement = MakePlacement(v[0], v[1], v[2], v[3], v[4], v[5]);
    }
    else if (!arg.empty() && arg[0] == '-')
    {
      Fail("unknown option '" + arg + "'");
      Usage(stderr);
      return 1;
    }
    else
      files.push_back({arg, RKMMathTransformation()});
  }

  ProgressLine progress;
  std::vector<PlacedMesh> meshes;
  double readSeconds = 0.0;
  std::string error;
  const bool read = LoadScene(files, kEmbeddedBunnyObj, meshes, readSeconds, error,
                              [&](const std::string &path, double f) { progress.Show("reading " + path, f); });
  progress.Clear();
  if (!read)
    return Fail(error);

  options.progress = [&](const char *phase, double f) { progress.Show(phase, f); };
  ClashReport report;
  const bool found = FindClashes(meshes, options, report, error);
  progress.Clear();
  if (!found)
    return Fail(error);

  std::printf("%zu meshes:", meshes.size());
  for (const PlacedMesh &m : meshes)
  {
    std::printf(" %s (%zu triangles)%s", m.mesh.name.c_str(), m.mesh.triangles.size(),
                &m == &meshes.back() ? "\n" : ",");
  }
  std::printf("exact arithmetic: %s\n", options.gridded ? "gridded (coordinates snapped to a common grid)"
                                                        : "adaptive (on the placed coordinates as they are)");
  std::printf("time: read %.3f s, build %.3f s, walk %.3f s (%ld object pairs, %ld triangle pairs tested "
              "exactly)\n",
              readSeconds, report.buildSeconds, report.walkSeconds, report.objectPairsTested,
              report.trianglePairsTested);
  if (report.pairs.empty())
    std::printf("no two meshes come near each other\n");
  for (const ObjectPairReport &p : report.pairs)
    std::printf("%s x %s: %ld crossing triangle pairs, %ld touching only, %ld coplanar overlaps\n",
                meshes[static_cast<size_t>(p.object[0])].mesh.name.c_str(),
                meshes[static_cast<size_t>(p.object[1])].mesh.name.c_str(), p.crossing, p.touching, p.coplanar);

  const OutputFiles out = OutputFilesFor(prefix);
  if (!WriteOutputs(out, meshes, report, view, error))
  {
    // Running out of memory ends with 1, as in every other phase; a file that cannot be written with 2.
    const bool memory = error.empty() || error.rfind("out of memory", 0) == 0;
    Fail(error);
    return memory ? 1 : 2;
  }
  std::printf("wrote %s (intersection curves) and %s (picture seen along %c)\n", out.curves.c_str(),
              out.picture.c_str(), 'x' + view);
  return 0;
}
} // namespace

int main(int argc, char **argv)
{
  // The core reports running out of memory as a failure; what is left is this file's own strings.
  try
  {
    if (!ReserveMemoryForFailures())
      return Fail(std::string());
    return Run(argc, argv);
  }
  catch (const std::bad_alloc &)
  {
    return Fail(std::string());
  }
}
