// Exact clash detection between triangle meshes: reads two or more meshes (OBJ, STL, OFF), places
// each by an optional rigid motion, and reports for every pair of meshes the triangle pairs that
// cross, that only touch, and that overlap in a common plane, with the intersection curves written
// as OBJ polylines and an SVG picture. With no argument it runs on a built-in scene: a bunny against
// a turned and shifted copy of itself.

#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <cstring>
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
               "  Reports the exact contacts between every two of the meshes (OBJ, STL or OFF).\n"
               "  --place tx ty tz rx ry rz  moves the mesh before it: rotations in degrees about x, y, z,\n"
               "                             then the translation\n"
               "  --gridded                  decide on coordinates snapped to a common grid (default:\n"
               "                             on the placed coordinates as they are)\n"
               "  --strategy flat|grid|greedy  how the hierarchies are built (default grid)\n"
               "  --view x|y|z               the axis the picture is seen along (default z)\n"
               "  --out PREFIX               output files PREFIX_curves.obj and PREFIX.svg (default clash)\n"
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

bool ParseDouble(const char *s, double &v)
{
  char *end = nullptr;
  v = std::strtod(s, &end);
  return end && end != s && *end == '\0';
}

bool ToInput(const Mesh &in, InputMesh &out)
{
  out.vertices = in.vertices;
  out.triangles = in.triangles;
  out.name = in.name;
  return true;
}

double Seconds(std::chrono::steady_clock::time_point since)
{
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - since).count();
}
} // namespace

int main(int argc, char **argv)
{
  ClashOptions options;
  int view = 2;
  std::string prefix = "clash";
  std::vector<std::string> paths;
  std::vector<RKMMathTransformation> placements;
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
        options.strategy = 0;
      else if (s == "grid")
        options.strategy = 1;
      else if (s == "greedy")
        options.strategy = 2;
      else
      {
        std::fprintf(stderr, "rkm_clash: unknown strategy '%s'\n", s.c_str());
        return 1;
      }
    }
    else if (arg == "--view" && i + 1 < argc)
    {
      const std::string s = argv[++i];
      if (s != "x" && s != "y" && s != "z")
      {
        std::fprintf(stderr, "rkm_clash: --view takes x, y or z\n");
        return 1;
      }
      view = s[0] - 'x';
    }
    else if (arg == "--out" && i + 1 < argc)
      prefix = argv[++i];
    else if (arg == "--place")
    {
      double v[6];
      if (paths.empty() || i + 6 >= argc)
      {
        std::fprintf(stderr, "rkm_clash: --place follows a mesh and takes six numbers\n");
        return 1;
      }
      for (int k = 0; k < 6; ++k)
        if (!ParseDouble(argv[i + 1 + k], v[k]) || !std::isfinite(v[k]))
        {
          std::fprintf(stderr, "rkm_clash: --place: '%s' is not a number\n", argv[i + 1 + k]);
          return 1;
        }
      i += 6;
      placements.back() = MakePlacement(v[0], v[1], v[2], v[3], v[4], v[5]);
    }
    else if (!arg.empty() && arg[0] == '-')
    {
      std::fprintf(stderr, "rkm_clash: unknown option '%s'\n", arg.c_str());
      Usage(stderr);
      return 1;
    }
    else
    {
      paths.push_back(arg);
      placements.emplace_back();
    }
  }

  ProgressLine progress;
  std::vector<PlacedMesh> meshes;
  const auto readStart = std::chrono::steady_clock::now();
  if (paths.empty())
  {
    Mesh bunny;
    std::string error;
    if (!ReadMeshFromMemory(kEmbeddedBunnyObj, "obj", "bunny (built in)", bunny, error))
    {
      std::fprintf(stderr, "rkm_clash: %s\n", error.c_str());
      return 1;
    }
    PlacedMesh a, b;
    ToInput(bunny, a.mesh);
    ToInput(bunny, b.mesh);
    b.mesh.name = "bunny, turned and shifted";
    b.placement = MakePlacement(0.9, 0.4, 0.3, 8.0, 25.0, 4.0);
    meshes.push_back(std::move(a));
    meshes.push_back(std::move(b));
  }
  else
    for (size_t i = 0; i < paths.size(); ++i)
    {
      Mesh m;
      std::string error;
      const bool ok =
          ReadMesh(paths[i], m, error, [&](double f) { progress.Show("reading " + paths[i], f); });
      progress.Clear();
      if (!ok)
      {
        std::fprintf(stderr, "rkm_clash: %s\n", error.c_str());
        return 1;
      }
      PlacedMesh p;
      ToInput(m, p.mesh);
      p.placement = placements[i];
      meshes.push_back(std::move(p));
    }
  const double readSeconds = Seconds(readStart);
  if (meshes.size() < 2)
  {
    std::fprintf(stderr, "rkm_clash: give at least two meshes (or none for the built-in scene)\n");
    return 1;
  }

  options.progress = [&](const char *phase, double f) { progress.Show(phase, f); };
  ClashReport report;
  std::string error;
  const bool ok = FindClashes(meshes, options, report, error);
  progress.Clear();
  if (!ok)
  {
    std::fprintf(stderr, "rkm_clash: %s\n", error.c_str());
    return 1;
  }

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

  const std::string objPath = prefix + "_curves.obj", svgPath = prefix + ".svg";
  if (!WriteCurvesObj(objPath, report, error) || !WriteSvg(svgPath, meshes, report, view, error))
  {
    std::fprintf(stderr, "rkm_clash: %s\n", error.c_str());
    return 2;
  }
  std::printf("wrote %s (intersection curves) and %s (picture seen along %c)\n", objPath.c_str(), svgPath.c_str(),
              'x' + view);
  return 0;
}
