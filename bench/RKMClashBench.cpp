// The clash query on real meshes, three ways on the same placed triangles: ours (hierarchies from
// RKMBVHTreeBuilder, a tree set, the pair descent with the exact triangle intersector, in the
// adaptive and gridded modes), CGAL (box intersection with its exact triangle test) and FCL
// (OBBRSS and AABB hierarchies, floating-point triangle test). Each method runs in a child process
// so that its peak memory is its own; the parent compares the answers: ours and CGAL's must agree
// pair for pair (the program fails otherwise), FCL's differences are reported as its own.
//
// usage: rkm_bench_clash [mesh folder] [scene...]   (folder filled by bench/get_meshes.sh)

#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "RKMClash.h"
#include "RKMClashBenchPeers.h"
#include "RKMMath3x3Matrix.h"
#include "RKMMeshReader.h"

namespace
{
using namespace rkmclash;

struct Scene
{
  std::string name;
  std::vector<PlacedMesh> meshes;
  std::vector<BenchSoup> soups;
  long triangles = 0;
};

struct Outcome
{
  bool ran = false;
  double build = 0.0, query = 0.0;
  long peakKB = 0;
  std::vector<BenchContact> contacts;
};

bool Load(const std::string &path, Mesh &out)
{
  std::string error;
  if (!ReadMesh(path, out, error))
  {
    std::fprintf(stderr, "%s\n", error.c_str());
    return false;
  }
  return true;
}

// Rotated by small angles about the mesh's box centre and moved by about 1% of its box diagonal.
RKMMathTransformation NearCopy(const Mesh &m, double rx, double ry, double rz, double fraction)
{
  double lo[3] = {HUGE_VAL, HUGE_VAL, HUGE_VAL}, hi[3] = {-HUGE_VAL, -HUGE_VAL, -HUGE_VAL};
  for (const auto &v : m.vertices)
    for (int k = 0; k < 3; ++k)
    {
      lo[k] = std::min(lo[k], v[k]);
      hi[k] = std::max(hi[k], v[k]);
    }
  const double diag = std::sqrt((hi[0] - lo[0]) * (hi[0] - lo[0]) + (hi[1] - lo[1]) * (hi[1] - lo[1]) +
                                (hi[2] - lo[2]) * (hi[2] - lo[2]));
  const RKMMathTransformation r = MakePlacement(0, 0, 0, rx, ry, rz);
  const RKMMathPoint c((lo[0] + hi[0]) / 2, (lo[1] + hi[1]) / 2, (lo[2] + hi[2]) / 2);
  const double d = fraction * diag / std::sqrt(3.0);
  // p ↦ R(p − c) + c + d.
  const RKMMathPoint rc = r * c;
  return MakePlacement(c.x - rc.x + d, c.y - rc.y + d, c.z - rc.z + d, rx, ry, rz);
}

void Finish(Scene &s)
{
  for (const PlacedMesh &m : s.meshes)
  {
    BenchSoup soup;
    soup.vertices = PlacedVertices(m);
    soup.triangles = m.mesh.triangles;
    s.triangles += static_cast<long>(soup.triangles.size());
    s.soups.push_back(std::move(soup));
  }
}

bool MakeScene(const std::string &dir, const std::string &name, Scene &s)
{
  s.name = name;
  if (name == "assembly")
  {
    Mesh bike, buildings;
    if (!Load(dir + "/motorBike.obj", bike) || !Load(dir + "/buildings.obj", buildings))
      return false;
    // Three bikes riding into each other, the middle one into a building's wall.
    s.meshes.push_back({buildings, RKMMathTransformation()});
    s.meshes.push_back({bike, MakePlacement(100, 100, 0, 0, 0, 0)});
    s.meshes.push_back({bike, MakePlacement(100.8, 100.1, 0.05, 0, 2, 25)});
    s.meshes.push_back({bike, MakePlacement(101.5, 99.6, 0.0, 0, 0, -20)});
  }
  else
  {
    Mesh m;
    if (!Load(dir + "/" + name, m))
      return false;
    s.meshes.push_back({m, RKMMathTransformation()});
    s.meshes.push_back({m, NearCopy(m, 2.0, 3.0, 1.5, 0.01)});
  }
  Finish(s);
  return true;
}

std::vector<BenchContact> OursContacts(const ClashReport &r)
{
  std::vector<BenchContact> out;
  for (const ObjectPairReport &p : r.pairs)
    for (const TrianglePair &t : p.pairs)
      out.push_back({p.object[0], p.object[1], t.triangle[0], t.triangle[1]});
  return out;
}

// Runs a method in a child; the child sends back its times and contacts through a pipe.
Outcome InChild(const std::function<BenchPeerResult()> &method)
{
  Outcome o;
  int fd[2];
  if (pipe(fd) != 0)
    return o;
  std::fflush(stdout);
  const pid_t pid = fork();
  if (pid == 0)
  {
    close(fd[0]);
    const BenchPeerResult r = method();
    const double times[2] = {r.buildSeconds, r.querySeconds};
    const long n = static_cast<long>(r.contacts.size());
    auto put = [&](const void *p, size_t bytes) {
      const char *c = static_cast<const char *>(p);
      while (bytes > 0)
      {
        const ssize_t w = write(fd[1], c, bytes);
        if (w <= 0)
          _exit(1);
        c += w;
        bytes -= static_cast<size_t>(w);
      }
    };
    put(times, sizeof times);
    put(&n, sizeof n);
    put(r.contacts.data(), sizeof(BenchContact) * r.contacts.size());
    close(fd[1]);
    _exit(0);
  }
  close(fd[1]);
  auto get = [&](void *p, size_t bytes) {
    char *c = static_cast<char *>(p);
    while (bytes > 0)
    {
      const ssize_t got = read(fd[0], c, bytes);
      if (got <= 0)
        return false;
      c += got;
      bytes -= static_cast<size_t>(got);
    }
    return true;
  };
  double times[2];
  long n = 0;
  bool ok = get(times, sizeof times) && get(&n, sizeof n) && n >= 0;
  if (ok)
  {
    o.contacts.resize(static_cast<size_t>(n));
    ok = get(o.contacts.data(), sizeof(BenchContact) * static_cast<size_t>(n));
  }
  close(fd[0]);
  int status = 0;
  struct rusage usage;
  wait4(pid, &status, 0, &usage);
  o.ran = ok && WIFEXITED(status) && WEXITSTATUS(status) == 0;
  o.build = times[0];
  o.query = times[1];
  o.peakKB = usage.ru_maxrss;
  std::sort(o.contacts.begin(), o.contacts.end());
  return o;
}

BenchPeerResult Ours(const Scene &s, bool gridded, RKMBVHTreeBuilder::SpatialOptimization strategy)
{
  ClashOptions options;
  options.gridded = gridded;
  options.strategy = strategy;
  ClashReport report;
  std::string error;
  if (!FindClashes(s.meshes, options, report, error))
  {
    std::fprintf(stderr, "%s\n", error.c_str());
    _exit(1);
  }
  BenchPeerResult r;
  // Building counts placing and snapping the coordinates, the hierarchies and the tree set; as for
  // the peers, tearing them down is not timed.
  r.querySeconds = report.walkSeconds;
  r.buildSeconds = report.prepareSeconds + report.buildSeconds;
  r.contacts = OursContacts(report);
  return r;
}

// How many of a's contacts b lacks.
long Missing(const std::vector<BenchContact> &a, const std::vector<BenchContact> &b)
{
  std::vector<BenchContact> d;
  std::set_difference(a.begin(), a.end(), b.begin(), b.end(), std::back_inserter(d));
  return static_cast<long>(d.size());
}
} // namespace

int main(int argc, char **argv)
{
  const std::string dir = argc > 1 ? argv[1] : "bench/meshes";
  std::vector<std::string> names;
  for (int i = 2; i < argc; ++i)
    names.push_back(argv[i]);
  if (names.empty())
    names = {"armadillo.off", "head.stl", "motorBike.obj", "buildings.obj", "assembly"};

  bool agree = true;
  std::printf("| scene | triangles | method | build s | query s | total s | peak MB | pairs | vs CGAL |\n"
              "|---|---|---|---|---|---|---|---|---|\n");
  for (const std::string &name : names)
  {
    Scene s;
    if (!MakeScene(dir, name, s))
      return 2;
    struct Method
    {
      std::string label;
      std::function<BenchPeerResult()> run;
    };
    std::vector<Method> methods = {
        {"ours, grid builder, adaptive", [&] { return Ours(s, false, RKMBVHTreeBuilder::Basic); }},
        {"ours, grid builder, gridded", [&] { return Ours(s, true, RKMBVHTreeBuilder::Basic); }},
        {"CGAL box_intersection_d + do_intersect", [&] { return CgalClash(s.soups); }},
        {"FCL OBBRSS", [&] { return FclClash(s.soups, true); }},
        {"FCL AABB", [&] { return FclClash(s.soups, false); }},
    };
    // The greedy builder is quadratic in the triangles of a mesh (330 s for the armadillo's two
    // meshes of 52,000): only where that stays short.
    if (s.triangles <= 20000)
      methods.insert(methods.begin() + 2,
                     {"ours, greedy builder, adaptive", [&] { return Ours(s, false, RKMBVHTreeBuilder::Best); }});
    std::vector<Outcome> outcomes;
    for (const Method &m : methods)
      outcomes.push_back(InChild(m.run));
    const Outcome *cgal = nullptr;
    for (size_t k = 0; k < methods.size(); ++k)
      if (methods[k].label.rfind("CGAL", 0) == 0 && outcomes[k].ran)
        cgal = &outcomes[k];
    for (size_t k = 0; k < methods.size(); ++k)
    {
      const Outcome &o = outcomes[k];
      std::string versus = "—";
      if (!o.ran)
        versus = "failed";
      else if (cgal && &o != cgal)
      {
        const long missing = Missing(cgal->contacts, o.contacts), extra = Missing(o.contacts, cgal->contacts);
        versus = missing == 0 && extra == 0 ? "identical"
                                            : std::to_string(missing) + " missing, " + std::to_string(extra) + " extra";
        // The gridded run decides on coordinates snapped to the grid, a slightly different scene: its
        // differences are its own. Every other run of ours sees exactly CGAL's triangles.
        const bool snapped = methods[k].label.find("gridded") != std::string::npos;
        if (snapped && (missing || extra))
          versus += " (snapped coordinates)";
        if (methods[k].label.rfind("ours", 0) == 0 && !snapped && (missing || extra))
          agree = false;
      }
      std::printf("| %s | %ld | %s | %.3f | %.3f | %.3f | %.0f | %zu | %s |\n", s.name.c_str(), s.triangles,
                  methods[k].label.c_str(), o.build, o.query, o.build + o.query, static_cast<double>(o.peakKB) / 1024.0,
                  o.contacts.size(), versus.c_str());
      std::fflush(stdout);
    }
  }
  if (!agree)
  {
    std::fprintf(stderr, "ours and CGAL disagree on some pair\n");
    return 1;
  }
  return 0;
}
