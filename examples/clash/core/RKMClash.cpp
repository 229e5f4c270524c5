// The clash pipeline: the exact scene, the hierarchy walks over objects and over triangles, the leaves
// that name triangles, and the scene's reading and the report's writing around them.

#include "RKMClash.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <memory>
#include <new>
#include <set>
#include <system_error>
#include <utility>

#include "RKMBVHAttribute.h"
#include "RKMBVHDescentOperator.h"
#include "RKMBVHNode.h"
#include "RKMBVHNodeListIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeSet.h"
#include "RKMListPtrRKMBVHNodeConst.h"
#include "RKMMath3x3Matrix.h"
#include "RKMMathBox.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyConstruction.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyIntersection.h"
#include "RKMPolyNormalizeUtils.h"
#include "RKMPolyTriangleIntersector.h"
#include "RKMRef.h"

namespace rkmclash
{
namespace
{
constexpr double kPi = 3.14159265358979323846;
// Enough for an exception and a message when everything else is taken.
constexpr std::size_t kFailureReserve = 256 * 1024;

double Seconds(std::chrono::steady_clock::time_point since)
{
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - since).count();
}

// Fails with "out of memory while <doing> <what>"; building that message may itself run out, leaving
// it empty.
bool OutOfMemory(std::string &error, const char *doing, const std::string &what = std::string()) noexcept
{
  try
  {
    error = std::string("out of memory while ") + doing + (what.empty() ? "" : " ") + what;
  }
  catch (...)
  {
    error.clear();
  }
  return false;
}

/// Names the triangle a leaf stands for.
class TriangleAttribute : public RKMBVHAttribute
{
public:
  explicit TriangleAttribute(int index) : index(index) {}
  int index;
};

int TriangleOf(const RKMBVHNodeConst &leaf)
{
  const auto *a = dynamic_cast<const TriangleAttribute *>(leaf.GetAttribute());
  return a ? a->index : -1;
}

RKMMathPoint ToPoint(const std::array<double, 3> &v)
{
  return RKMMathPoint(v[0], v[1], v[2]);
}

std::array<double, 3> ToArray(const RKMMathPoint &p)
{
  return {p.x, p.y, p.z};
}

// The coordinates every exact decision is taken on: the placed vertices, snapped to one grid for the
// whole scene in the gridded mode.
struct Scene
{
  std::unique_ptr<RKMPolyExactArithmetic> arithmetic;
  std::vector<std::vector<RKMMathPoint>> placed;
  // The volumes are built on the meshes' own coordinates and placed by the walk; snapping may move a
  // placed vertex by up to ε along each axis, which this tolerance covers.
  double tolerance = 0.0;
};

// May throw std::bad_alloc.
bool MakeScene(const std::vector<PlacedMesh> &meshes, bool gridded, Scene &scene, std::string &error)
{
  scene.placed.clear();
  for (const PlacedMesh &m : meshes)
  {
    std::vector<RKMMathPoint> pts;
    pts.reserve(m.mesh.vertices.size());
    for (const auto &v : m.mesh.vertices)
    {
      const RKMMathPoint p = m.placement * ToPoint(v);
      if (!std::isfinite(p.x) || !std::isfinite(p.y) || !std::isfinite(p.z))
      {
        error = m.mesh.name + ": a placed coordinate is not finite";
        return false;
      }
      pts.push_back(p);
    }
    for (const auto &t : m.mesh.triangles)
      for (int k : t)
        if (k < 0 || k >= static_cast<int>(pts.size()))
        {
          error = m.mesh.name + ": a triangle refers to vertex " + std::to_string(k) + ", which does not exist";
          return false;
        }
    scene.placed.push_back(std::move(pts));
  }
  if (!gridded)
  {
    scene.arithmetic = std::make_unique<RKMPolyExactArithmetic>(RKMPolyExactArithmetic::Adaptive);
    // Without its kernel the arithmetic would answer 0 to every orientation.
    if (!scene.arithmetic->IsValid())
      throw std::bad_alloc();
    return true;
  }
  std::vector<RKMMathPoint> all;
  for (const auto &pts : scene.placed)
    all.insert(all.end(), pts.begin(), pts.end());
  RKMMathBox box;
  RKMPolyExactArithmetic *arithmetic = nullptr;
  const HRESULT hr =
      RKMPolyNormalizeUtils::NormalizePoints(all.data(), static_cast<int>(all.size()), box, arithmetic);
  scene.arithmetic.reset(arithmetic);
  if (hr == E_OUTOFMEMORY)
    throw std::bad_alloc();
  if (FAILED(hr))
  {
    error = "the scene's coordinates cannot be snapped to a grid";
    return false;
  }
  size_t k = 0;
  for (auto &pts : scene.placed)
    for (auto &p : pts)
      p = all[k++];
  scene.tolerance = 4.0 * scene.arithmetic->GetCoordinatePrecision();
  return true;
}

// 1 when the triangle has vertices strictly on both sides of the plane of the other.
bool Straddles(const RKMPolyExactArithmetic &ar, const RKMMathPoint *t, const RKMMathPoint *plane)
{
  bool below = false, above = false;
  for (int k = 0; k < 3; ++k)
  {
    const int s = ar.Orientation3D(plane[0], plane[1], plane[2], t[k]);
    below |= s < 0;
    above |= s > 0;
  }
  return below && above;
}

// The coordinates of an intersection point from its features: a vertex is itself, a bar of one
// triangle crossing the other is built where it meets the other's plane.
bool PointOf(const RKMPolyIntersectionPoint &pt, const RKMMathPoint *t1, const RKMMathPoint *t2, RKMMathPoint &out)
{
  const RKMMathPoint *tri[2] = {t1, t2};
  for (int s = 0; s < 2; ++s)
    if (pt.GetVertexIndex(s) >= 0)
    {
      out = tri[s][pt.GetVertexIndex(s)];
      return true;
    }
  for (int s = 0; s < 2; ++s)
    if (pt.GetBarIndex(s) >= 0)
    {
      const int b = pt.GetBarIndex(s);
      const RKMMathPoint *o = tri[1 - s];
      return SUCCEEDED(
          RKMPolyConstruction::ConstructIntersection(tri[s][b], tri[s][(b + 1) % 3], o[0], o[1], o[2], out));
    }
  return false;
}

// Tests one pair of triangles exactly and records the contact, if any. False when the intersector could
// not decide, which it does only when it lacks the 2D intersector it could not allocate. May throw
// std::bad_alloc.
bool TestTriangles(const Scene &scene, const std::vector<PlacedMesh> &meshes, int objA, int ta, int objB, int tb,
                   RKMPolyTriangleIntersector &intersector, ObjectPairReport &out)
{
  const auto &ia = meshes[objA].mesh.triangles[ta];
  const auto &ib = meshes[objB].mesh.triangles[tb];
  const RKMMathPoint t1[3] = {scene.placed[objA][ia[0]], scene.placed[objA][ia[1]], scene.placed[objA][ia[2]]};
  const RKMMathPoint t2[3] = {scene.placed[objB][ib[0]], scene.placed[objB][ib[1]], scene.placed[objB][ib[2]]};
  const int r = intersector.Intersect(t1, t2);
  if (r == RKMPolyIntersection::ResultUndetermined)
    return false;
  ContactKind kind;
  if (intersector.AreTrianglesCoplanar())
  {
    if (r == RKMPolyIntersection::ResultPolygon)
      kind = ContactKind::CoplanarOverlap;
    else if (r == RKMPolyIntersection::ResultOnePoint || r == RKMPolyIntersection::ResultTwoPoints)
      kind = ContactKind::Touching;
    else
      return true;
  }
  else if (r == RKMPolyIntersection::ResultOnePoint)
    kind = ContactKind::Touching;
  else if (r == RKMPolyIntersection::ResultTwoPoints)
    kind = Straddles(*scene.arithmetic, t1, t2) && Straddles(*scene.arithmetic, t2, t1) ? ContactKind::Crossing
                                                                                      : ContactKind::Touching;
  else
    return true;
  out.pairs.push_back({{ta, tb}, kind});
  if (kind == ContactKind::Crossing)
  {
    ++out.crossing;
    int n = 0;
    const RKMPolyIntersectionPoint *pts = intersector.GetIntersectionPoints(n);
    RKMMathPoint p, q;
    if (n == 2 && PointOf(pts[0], t1, t2, p) && PointOf(pts[1], t1, t2, q))
      out.curves.push_back({ToArray(p), ToArray(q)});
  }
  else if (kind == ContactKind::Touching)
    ++out.touching;
  else
    ++out.coplanar;
  return true;
}

// A walk whose leaves may run out of memory. No exception may cross the library's descent, so the first
// failure is kept and makes Filter prune whatever is left; Filter runs for every pair anyway, where an
// IsStopped of our own was measured to slow the walk down.
class WalkThatMayFail : public RKMBVHDescentOperator
{
public:
  bool failed = false;

protected:
  HRESULT Fail()
  {
    failed = true;
    return E_OUTOFMEMORY;
  }
};

// Pairs of objects whose placed volumes meet, from the overall tree walked against itself.
class ObjectPairWalk : public WalkThatMayFail
{
public:
  explicit ObjectPairWalk(double tolerance) : m_tolerance(tolerance) {}
  std::set<std::pair<int, int>> pairs;

protected:
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return !failed && RKMPolyBVBVOperations::BVOverLap(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(),
                                                       m_tolerance, nullptr, nullptr);
  }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    const int ia = RKMBVHTreeSet::GetObjectId(a), ib = RKMBVHTreeSet::GetObjectId(b);
    if (ia == ib || ia < 0 || ib < 0)
      return S_OK;
    try
    {
      pairs.insert({std::min(ia, ib), std::max(ia, ib)});
    }
    catch (const std::bad_alloc &)
    {
      return Fail();
    }
    return S_OK;
  }

private:
  double m_tolerance;
};

// The triangle pairs of two placed objects whose volumes meet, each tested exactly.
class TrianglePairWalk : public WalkThatMayFail
{
public:
  TrianglePairWalk(const Scene &scene, const std::vector<PlacedMesh> &meshes, int a, int b, ObjectPairReport &out,
                   const std::function<void()> &tick)
      : m_scene(scene), m_meshes(meshes), m_a(a), m_b(b), m_intersector(*scene.arithmetic), m_out(out), m_tick(tick)
  {
    // The second tree's volumes are placed into the first one's frame, so each test places one
    // volume instead of both. The motions are rigid: distances, and so the tolerance, carry over.
    RKMMathTransformation inverse = meshes[a].placement;
    m_relativeOk = SUCCEEDED(inverse.ComputeInverse());
    m_relative = inverse * meshes[b].placement;
  }
  long tested = 0;

protected:
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    if (failed)
      return 0;
    if (m_relativeOk)
      return RKMPolyBVBVOperations::BVOverLapOnePos(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(),
                                                    m_scene.tolerance, &m_relative);
    return RKMPolyBVBVOperations::BVOverLap(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(),
                                            m_scene.tolerance, &m_meshes[m_a].placement, &m_meshes[m_b].placement);
  }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    const int ta = TriangleOf(a), tb = TriangleOf(b);
    if (ta < 0 || tb < 0)
      return S_OK;
    try
    {
      if (!TestTriangles(m_scene, m_meshes, m_a, ta, m_b, tb, m_intersector, m_out))
        return Fail();
      if ((++tested & 0xFFFF) == 0 && m_tick)
        m_tick();
    }
    catch (const std::bad_alloc &)
    {
      return Fail();
    }
    return S_OK;
  }

private:
  const Scene &m_scene;
  const std::vector<PlacedMesh> &m_meshes;
  int m_a, m_b;
  RKMMathTransformation m_relative;
  bool m_relativeOk = false;
  RKMPolyTriangleIntersector m_intersector;
  ObjectPairReport &m_out;
  const std::function<void()> &m_tick;
};

// The leaves made so far, deleted with it unless a tree has taken them over.
struct OwnedLeaves
{
  OwnedLeaves() = default;
  OwnedLeaves(const OwnedLeaves &) = delete;
  OwnedLeaves &operator=(const OwnedLeaves &) = delete;
  ~OwnedLeaves()
  {
    for (int i = 1; i <= list.Size(); ++i)
      delete list[i];
  }
  RKMListPtrRKMBVHNodeConst list;
};

// One tree per mesh over leaves that carry each triangle's box, on the mesh's own coordinates; empty
// with the builder's (or E_OUTOFMEMORY) in hr when it cannot be made.
RKMRef<RKMBVHTree> BuildTree(const Mesh &mesh, RKMBVHTreeBuilder::SpatialOptimization strategy, HRESULT &hr)
{
  OwnedLeaves leaves;
  hr = E_OUTOFMEMORY;
  for (size_t i = 0; i < mesh.triangles.size(); ++i)
  {
    RKMMathBox box;
    for (int k : mesh.triangles[i])
      box.AddInside(ToPoint(mesh.vertices[static_cast<size_t>(k)]));
    // Volumes and nodes come from the library's pools, whose new gives null when they run dry.
    RKMPolyAABB *volume = new RKMPolyAABB(box);
    RKMBVHNode *leaf = volume ? new RKMBVHNode(volume) : nullptr;
    if (!leaf)
    {
      delete volume;
      return {};
    }
    auto *attribute = new (std::nothrow) TriangleAttribute(static_cast<int>(i));
    if (attribute)
      leaf->SetAttribute(attribute);
    if (!attribute || !leaves.list.Append(leaf))
    {
      delete leaf;
      return {};
    }
  }
  RKMBVHNodeListIterator it(leaves.list, leaves.list.Size());
  RKMBVHTree *tree = nullptr;
  hr = RKMBVHTreeBuilder(strategy).Run(it, tree);
  if (FAILED(hr))
    return {};
  leaves.list.RemoveAll();
  return RKMRef<RKMBVHTree>::Adopt(tree);
}

// FindClashes past the check of its arguments; may throw std::bad_alloc, with `phase` saying where.
bool FindClashesOrThrow(const std::vector<PlacedMesh> &meshes, const ClashOptions &options, ClashReport &report,
                        std::string &error, const char *&phase)
{
  phase = "placing the meshes";
  const auto prepareStart = std::chrono::steady_clock::now();
  Scene scene;
  if (!MakeScene(meshes, options.gridded, scene, error))
    return false;
  report.prepareSeconds = Seconds(prepareStart);

  phase = "building the hierarchies";
  const auto buildStart = std::chrono::steady_clock::now();
  RKMBVHTreeSet set(options.strategy, RKMPolyBoundingVolume::TypeAABB);
  int trees = 0;
  for (size_t i = 0; i < meshes.size(); ++i)
  {
    if (options.progress)
      options.progress("build", static_cast<double>(i) / static_cast<double>(meshes.size()));
    if (meshes[i].mesh.triangles.empty())
      continue;
    HRESULT hr = S_OK;
    const RKMRef<RKMBVHTree> tree = BuildTree(meshes[i].mesh, options.strategy, hr);
    if (tree)
      hr = set.AddTree(static_cast<int>(i), tree.Get(), &meshes[i].placement);
    if (hr == E_OUTOFMEMORY)
      throw std::bad_alloc();
    if (FAILED(hr))
    {
      error = meshes[i].mesh.name +
              (tree ? ": the hierarchy could not be placed" : ": the hierarchy could not be built");
      return false;
    }
    ++trees;
  }
  // The overall tree is built on demand; the set answers null when that fails.
  const RKMRef<RKMBVHTree> overall = RKMRef<RKMBVHTree>::Adopt(set.GetTree());
  if (trees > 0 && !overall)
    throw std::bad_alloc();
  report.buildSeconds = Seconds(buildStart);

  phase = "walking the hierarchies";
  const auto walkStart = std::chrono::steady_clock::now();
  if (overall)
  {
    ObjectPairWalk objects(scene.tolerance);
    objects.Descend(*overall, *overall);
    if (objects.failed)
      throw std::bad_alloc();
    long done = 0;
    const std::function<void()> tick = [&] {
      if (options.progress)
        options.progress("walk", static_cast<double>(done) / static_cast<double>(objects.pairs.size()));
    };
    for (const auto &[a, b] : objects.pairs)
    {
      const RKMBVHNodeConst *la = nullptr, *lb = nullptr;
      if (FAILED(set.GetObjectNode(a, la)) || FAILED(set.GetObjectNode(b, lb)))
        continue;
      RKMBVHTree *treeA = RKMBVHTreeSet::GetTree(*la), *treeB = RKMBVHTreeSet::GetTree(*lb);
      if (!treeA || !treeB)
        continue;
      ObjectPairReport pair;
      pair.object[0] = a;
      pair.object[1] = b;
      TrianglePairWalk walk(scene, meshes, a, b, pair, tick);
      walk.Descend(*treeA, *treeB);
      if (walk.failed)
        throw std::bad_alloc();
      report.trianglePairsTested += walk.tested;
      report.pairs.push_back(std::move(pair));
      ++done;
    }
    report.objectPairsTested = static_cast<long>(objects.pairs.size());
  }
  report.walkSeconds = Seconds(walkStart);
  return true;
}

// Writes through a file that is closed on every path; `write` may throw std::bad_alloc.
template <class Write> bool WriteFile(const std::string &path, std::string &error, Write &&write) noexcept
{
  try
  {
    std::unique_ptr<FILE, int (*)(FILE *)> file(std::fopen(path.c_str(), "w"), &std::fclose);
    if (!file)
    {
      error = path + ": cannot be written";
      return false;
    }
    write(file.get());
    if (std::ferror(file.get()) || std::fclose(file.release()) != 0)
    {
      error = path + ": writing failed";
      return false;
    }
    return true;
  }
  catch (const std::bad_alloc &)
  {
    return OutOfMemory(error, "writing", path);
  }
}
} // namespace

namespace
{
void *g_reserve = nullptr;

// The first failed allocation gives the reserve back and retries; without a handler any later failure
// throws std::bad_alloc, with memory to spare for the exception itself and the message after it.
void GiveBackTheReserve()
{
  std::free(g_reserve);
  g_reserve = nullptr;
  std::set_new_handler(nullptr);
}
} // namespace

bool ReserveMemoryForFailures() noexcept
{
  if (g_reserve)
    return true;
  g_reserve = std::malloc(kFailureReserve);
  if (!g_reserve)
    return false;
  std::set_new_handler(&GiveBackTheReserve);
  return true;
}

std::vector<std::array<double, 3>> PlacedVertices(const PlacedMesh &mesh)
{
  std::vector<std::array<double, 3>> out;
  for (const auto &v : mesh.mesh.vertices)
    out.push_back(ToArray(mesh.placement * ToPoint(v)));
  return out;
}

RKMMathTransformation MakePlacement(double tx, double ty, double tz, double rxDeg, double ryDeg, double rzDeg)
{
  const double ax = rxDeg * kPi / 180.0, ay = ryDeg * kPi / 180.0, az = rzDeg * kPi / 180.0;
  const RKMMath3x3Matrix rx(1, 0, 0, 0, std::cos(ax), -std::sin(ax), 0, std::sin(ax), std::cos(ax));
  const RKMMath3x3Matrix ry(std::cos(ay), 0, std::sin(ay), 0, 1, 0, -std::sin(ay), 0, std::cos(ay));
  const RKMMath3x3Matrix rz(std::cos(az), -std::sin(az), 0, std::sin(az), std::cos(az), 0, 0, 0, 1);
  return RKMMathTransformation(rz * (ry * rx), RKMMathVector(tx, ty, tz));
}

bool LoadScene(const std::vector<MeshFile> &files, const char *builtInBunnyObj, std::vector<PlacedMesh> &meshes,
               double &readSeconds, std::string &error,
               const std::function<void(const std::string &path, double fraction)> &progress)
{
  const auto start = std::chrono::steady_clock::now();
  std::string reading = "the meshes";
  try
  {
    std::vector<PlacedMesh> scene;
    if (files.empty())
    {
      reading = "bunny (built in)";
      PlacedMesh bunny;
      if (!ReadMeshFromMemory(builtInBunnyObj ? builtInBunnyObj : "", "obj", "bunny (built in)", bunny.mesh, error))
        return false;
      PlacedMesh copy = bunny;
      copy.mesh.name = "bunny, turned and shifted";
      copy.placement = MakePlacement(0.9, 0.4, 0.3, 8.0, 25.0, 4.0);
      scene.push_back(std::move(bunny));
      scene.push_back(std::move(copy));
    }
    else if (files.size() < 2)
    {
      error = "give at least two meshes (or none for the built-in scene)";
      return false;
    }
    for (const MeshFile &file : files)
    {
      reading = file.path;
      PlacedMesh placed;
      const std::function<void(double)> report = [&](double f) {
        if (progress)
          progress(file.path, f);
      };
      if (!ReadMesh(file.path, placed.mesh, error, report))
        return false;
      placed.placement = file.placement;
      scene.push_back(std::move(placed));
    }
    meshes = std::move(scene);
  }
  catch (const std::bad_alloc &)
  {
    return OutOfMemory(error, "reading", reading);
  }
  readSeconds = Seconds(start);
  return true;
}

bool FindClashes(const std::vector<PlacedMesh> &meshes, const ClashOptions &options, ClashReport &report,
                 std::string &error)
{
  report = ClashReport();
  const char *phase = "starting";
  try
  {
    if (meshes.size() < 2)
    {
      error = "at least two meshes are needed";
      return false;
    }
    return FindClashesOrThrow(meshes, options, report, error, phase);
  }
  catch (const std::bad_alloc &)
  {
    report = ClashReport();
    return OutOfMemory(error, phase);
  }
}

ObjectPairReport BruteForcePair(const std::vector<PlacedMesh> &meshes, int a, int b, bool gridded)
{
  ObjectPairReport out;
  out.object[0] = a;
  out.object[1] = b;
  Scene scene;
  std::string error;
  if (!MakeScene(meshes, gridded, scene, error))
    return out;
  RKMPolyTriangleIntersector intersector(*scene.arithmetic);
  const int na = static_cast<int>(meshes[a].mesh.triangles.size());
  const int nb = static_cast<int>(meshes[b].mesh.triangles.size());
  for (int i = 0; i < na; ++i)
    for (int j = 0; j < nb; ++j)
      TestTriangles(scene, meshes, a, i, b, j, intersector, out);
  return out;
}

OutputFiles OutputFilesFor(const std::string &prefix)
{
  std::error_code ec;
  std::string base = prefix.empty() ? "clash" : prefix;
  if (base.back() == '/' || std::filesystem::is_directory(base, ec))
    base = (std::filesystem::path(base) / "clash").string();
  return {base + "_curves.obj", base + ".svg"};
}

bool WriteOutputs(const OutputFiles &files, const std::vector<PlacedMesh> &meshes, const ClashReport &report, int axis,
                  std::string &error)
{
  try
  {
    for (const std::string &path : {files.curves, files.picture})
    {
      const std::filesystem::path folder = std::filesystem::path(path).parent_path();
      std::error_code ec;
      if (!folder.empty() && !std::filesystem::is_directory(folder, ec) &&
          !std::filesystem::create_directories(folder, ec))
      {
        error = folder.string() + ": the folder cannot be made: " + ec.message();
        return false;
      }
    }
  }
  catch (const std::bad_alloc &)
  {
    return OutOfMemory(error, "making the output folders");
  }
  return WriteCurvesObj(files.curves, report, error) && WriteSvg(files.picture, meshes, report, axis, error);
}

bool WriteCurvesObj(const std::string &path, const ClashReport &report, std::string &error)
{
  return WriteFile(path, error, [&](FILE *f) {
    std::fprintf(f, "# intersection curves: one polyline segment per crossing triangle pair\n");
    long v = 0;
    for (const ObjectPairReport &p : report.pairs)
    {
      if (p.curves.empty())
        continue;
      std::fprintf(f, "o clash_%d_%d\n", p.object[0], p.object[1]);
      for (const CurveSegment &s : p.curves)
      {
        std::fprintf(f, "v %.17g %.17g %.17g\nv %.17g %.17g %.17g\nl %ld %ld\n", s.from[0], s.from[1], s.from[2],
                     s.to[0], s.to[1], s.to[2], v + 1, v + 2);
        v += 2;
      }
    }
  });
}

bool WriteSvg(const std::string &path, const std::vector<PlacedMesh> &meshes, const ClashReport &report, int axis,
              std::string &error)
{
  // Seen along the axis: the other two coordinates, keeping a right-handed picture, with y up.
  const int u = (axis + 1) % 3, w = (axis + 2) % 3;
  std::vector<std::vector<std::array<double, 3>>> placed;
  double lo[2] = {HUGE_VAL, HUGE_VAL}, hi[2] = {-HUGE_VAL, -HUGE_VAL};
  try
  {
    for (const PlacedMesh &m : meshes)
    {
      placed.push_back(PlacedVertices(m));
      for (const auto &p : placed.back())
      {
        lo[0] = std::min(lo[0], p[u]);
        hi[0] = std::max(hi[0], p[u]);
        lo[1] = std::min(lo[1], p[w]);
        hi[1] = std::max(hi[1], p[w]);
      }
    }
    if (!(hi[0] >= lo[0]) || !(hi[1] >= lo[1]))
    {
      error = "nothing to draw";
      return false;
    }
  }
  catch (const std::bad_alloc &)
  {
    return OutOfMemory(error, "drawing", path);
  }
  const double size = 1000.0, margin = 20.0;
  const double span = std::max({hi[0] - lo[0], hi[1] - lo[1], 1e-300});
  const double scale = (size - 2 * margin) / span;
  auto X = [&](const std::array<double, 3> &p) { return margin + (p[u] - lo[0]) * scale; };
  auto Y = [&](const std::array<double, 3> &p) { return size - margin - (p[w] - lo[1]) * scale; };

  return WriteFile(path, error, [&](FILE *f) {
    std::fprintf(f, "<svg xmlns=\"http://www.w3.org/2000/svg\" width=\"%g\" height=\"%g\" viewBox=\"0 0 %g %g\">\n",
                 size, size, size, size);
    std::fprintf(f, "<rect width=\"100%%\" height=\"100%%\" fill=\"white\"/>\n");
    static const char *const kMeshColours[] = {"#8aa6c1", "#c1a78a", "#98c18a", "#b08ac1"};
    for (size_t m = 0; m < meshes.size(); ++m)
    {
      std::set<std::pair<int, int>> edges;
      for (const auto &t : meshes[m].mesh.triangles)
        for (int k = 0; k < 3; ++k)
          edges.insert({std::min(t[k], t[(k + 1) % 3]), std::max(t[k], t[(k + 1) % 3])});
      std::fprintf(f, "<path fill=\"none\" stroke=\"%s\" stroke-width=\"0.4\" stroke-opacity=\"0.7\" d=\"",
                   kMeshColours[m % 4]);
      for (const auto &[i, j] : edges)
      {
        const auto &p = placed[m][static_cast<size_t>(i)], &q = placed[m][static_cast<size_t>(j)];
        std::fprintf(f, "M%.2f %.2fL%.2f %.2f", X(p), Y(p), X(q), Y(q));
      }
      std::fprintf(f, "\"/>\n");
    }
    std::fprintf(f, "<path fill=\"none\" stroke=\"#d0021b\" stroke-width=\"2.2\" stroke-linecap=\"round\" d=\"");
    for (const ObjectPairReport &p : report.pairs)
      for (const CurveSegment &s : p.curves)
        std::fprintf(f, "M%.2f %.2fL%.2f %.2f", X(s.from), Y(s.from), X(s.to), Y(s.to));
    std::fprintf(f, "\"/>\n</svg>\n");
  });
}
} // namespace rkmclash
