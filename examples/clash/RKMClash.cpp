#include "RKMClash.h"

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstdio>
#include <memory>
#include <set>
#include <utility>

#include "RKMBVHAttribute.h"
#include "RKMBVHDescentOperator.h"
#include "RKMBVHNode.h"
#include "RKMBVHNodeListIterator.h"
#include "RKMBVHTree.h"
#include "RKMBVHTreeBuilder.h"
#include "RKMBVHTreeSet.h"
#include "RKMListPtrRKMBVHNodeConst.h"
#include "RKMMath3x3Matrix.h"
#include "RKMMathBox.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyConstruction.h"
#include "RKMPolyExactArithmetic.h"
#include "RKMPolyNormalizeUtils.h"
#include "RKMPolyTriangleIntersector.h"

namespace rkmclash
{
namespace
{
constexpr double kPi = 3.14159265358979323846;

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

// Tests one pair of triangles exactly and records the contact, if any.
void TestTriangles(const Scene &scene, const std::vector<PlacedMesh> &meshes, int objA, int ta, int objB, int tb,
                   RKMPolyTriangleIntersector &intersector, ObjectPairReport &out)
{
  const auto &ia = meshes[objA].mesh.triangles[ta];
  const auto &ib = meshes[objB].mesh.triangles[tb];
  const RKMMathPoint t1[3] = {scene.placed[objA][ia[0]], scene.placed[objA][ia[1]], scene.placed[objA][ia[2]]};
  const RKMMathPoint t2[3] = {scene.placed[objB][ib[0]], scene.placed[objB][ib[1]], scene.placed[objB][ib[2]]};
  const int r = intersector.Intersect(t1, t2);
  ContactKind kind;
  if (intersector.AreTrianglesCoplanar())
  {
    if (r == 3)
      kind = ContactKind::CoplanarOverlap;
    else if (r == 1 || r == 2)
      kind = ContactKind::Touching;
    else
      return;
  }
  else if (r == 1)
    kind = ContactKind::Touching;
  else if (r == 2)
    kind = Straddles(*scene.arithmetic, t1, t2) && Straddles(*scene.arithmetic, t2, t1) ? ContactKind::Crossing
                                                                                      : ContactKind::Touching;
  else
    return;
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
}

// Pairs of objects whose placed volumes meet, from the overall tree walked against itself.
class ObjectPairWalk : public RKMBVHDescentOperator
{
public:
  explicit ObjectPairWalk(double tolerance) : m_tolerance(tolerance) {}
  std::set<std::pair<int, int>> pairs;

protected:
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    return RKMPolyBVBVOperations::BVOverLap(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(), m_tolerance,
                                            nullptr, nullptr);
  }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    const int ia = RKMBVHTreeSet::GetObjectId(a), ib = RKMBVHTreeSet::GetObjectId(b);
    if (ia != ib && ia >= 0 && ib >= 0)
      pairs.insert({std::min(ia, ib), std::max(ia, ib)});
    return S_OK;
  }

private:
  double m_tolerance;
};

// The triangle pairs of two placed objects whose volumes meet, each tested exactly.
class TrianglePairWalk : public RKMBVHDescentOperator
{
public:
  TrianglePairWalk(const Scene &scene, const std::vector<PlacedMesh> &meshes, int a, int b,
                   const RKMMathTransformation *ta, const RKMMathTransformation *tb, ObjectPairReport &out,
                   const std::function<void()> &tick)
      : m_scene(scene), m_meshes(meshes), m_a(a), m_b(b), m_intersector(*scene.arithmetic), m_out(out), m_tick(tick)
  {
    // The second tree's volumes are placed into the first one's frame, so each test places one
    // volume instead of both. The motions are rigid: distances, and so the tolerance, carry over.
    RKMMathTransformation inverse = *ta;
    m_relativeOk = SUCCEEDED(inverse.ComputeInverse());
    m_relative = inverse * *tb;
    m_ta = ta;
    m_tb = tb;
  }
  long tested = 0;

protected:
  unsigned char Filter(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    if (m_relativeOk)
      return RKMPolyBVBVOperations::BVOverLapOnePos(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(),
                                                    m_scene.tolerance, &m_relative);
    return RKMPolyBVBVOperations::BVOverLap(a.GetFirstBoundingVolume(), b.GetFirstBoundingVolume(),
                                            m_scene.tolerance, m_ta, m_tb);
  }
  HRESULT ProcessLeafNodes(RKMBVHNodeConst &a, RKMBVHNodeConst &b) override
  {
    const int ta = TriangleOf(a), tb = TriangleOf(b);
    if (ta < 0 || tb < 0)
      return S_OK;
    TestTriangles(m_scene, m_meshes, m_a, ta, m_b, tb, m_intersector, m_out);
    if ((++tested & 0xFFFF) == 0 && m_tick)
      m_tick();
    return S_OK;
  }

private:
  const Scene &m_scene;
  const std::vector<PlacedMesh> &m_meshes;
  int m_a, m_b;
  const RKMMathTransformation *m_ta = nullptr, *m_tb = nullptr;
  RKMMathTransformation m_relative;
  bool m_relativeOk = false;
  RKMPolyTriangleIntersector m_intersector;
  ObjectPairReport &m_out;
  const std::function<void()> &m_tick;
};

// One tree per mesh over leaves that carry each triangle's box, on the mesh's own coordinates.
RKMBVHTree *BuildTree(const InputMesh &mesh, int strategy)
{
  RKMListPtrRKMBVHNodeConst leaves;
  for (size_t i = 0; i < mesh.triangles.size(); ++i)
  {
    RKMMathBox box;
    for (int k : mesh.triangles[i])
      box.AddInside(ToPoint(mesh.vertices[static_cast<size_t>(k)]));
    auto *leaf = new RKMBVHNode(new RKMPolyAABB(box));
    leaf->SetAttribute(new TriangleAttribute(static_cast<int>(i)));
    leaves.Append(leaf);
  }
  RKMBVHNodeListIterator it(leaves, leaves.Size());
  RKMBVHTree *tree = nullptr;
  const auto optimization = static_cast<RKMBVHTreeBuilder::SpatialOptimization>(strategy);
  if (FAILED(RKMBVHTreeBuilder(optimization).Run(it, tree)))
  {
    for (int i = 1; i <= leaves.Size(); ++i)
      delete leaves[i];
    return nullptr;
  }
  return tree;
}

double Seconds(std::chrono::steady_clock::time_point since)
{
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - since).count();
}
} // namespace

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

bool FindClashes(const std::vector<PlacedMesh> &meshes, const ClashOptions &options, ClashReport &report,
                 std::string &error)
{
  report = ClashReport();
  if (meshes.size() < 2)
  {
    error = "at least two meshes are needed";
    return false;
  }
  const auto prepareStart = std::chrono::steady_clock::now();
  Scene scene;
  if (!MakeScene(meshes, options.gridded, scene, error))
    return false;
  report.prepareSeconds = Seconds(prepareStart);

  const auto buildStart = std::chrono::steady_clock::now();
  RKMBVHTreeSet set(static_cast<RKMBVHTreeBuilder::SpatialOptimization>(options.strategy),
                    RKMPolyBoundingVolume::TypeAABB);
  for (size_t i = 0; i < meshes.size(); ++i)
  {
    if (options.progress)
      options.progress("build", static_cast<double>(i) / static_cast<double>(meshes.size()));
    if (meshes[i].mesh.triangles.empty())
      continue;
    RKMBVHTree *tree = BuildTree(meshes[i].mesh, options.strategy);
    if (!tree)
    {
      error = meshes[i].mesh.name + ": the hierarchy could not be built";
      return false;
    }
    const HRESULT hr = set.AddTree(static_cast<int>(i), tree, &meshes[i].placement);
    tree->Release();
    if (FAILED(hr))
    {
      error = meshes[i].mesh.name + ": the hierarchy could not be placed";
      return false;
    }
  }
  RKMBVHTree *overall = set.GetTree();
  report.buildSeconds = Seconds(buildStart);

  const auto walkStart = std::chrono::steady_clock::now();
  if (overall)
  {
    ObjectPairWalk objects(scene.tolerance);
    objects.Descend(*overall, *overall);
    overall->Release();
    long done = 0;
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
      const std::function<void()> tick = [&] {
        if (options.progress)
          options.progress("walk", static_cast<double>(done) / static_cast<double>(objects.pairs.size()));
      };
      TrianglePairWalk walk(scene, meshes, a, b, &meshes[a].placement, &meshes[b].placement, pair, tick);
      walk.Descend(*treeA, *treeB);
      report.trianglePairsTested += walk.tested;
      report.pairs.push_back(std::move(pair));
      ++done;
    }
    report.objectPairsTested = static_cast<long>(objects.pairs.size());
  }
  report.walkSeconds = Seconds(walkStart);
  return true;
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

bool WriteCurvesObj(const std::string &path, const ClashReport &report, std::string &error)
{
  FILE *f = std::fopen(path.c_str(), "w");
  if (!f)
  {
    error = path + ": cannot be written";
    return false;
  }
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
  const bool ok = std::fclose(f) == 0;
  if (!ok)
    error = path + ": writing failed";
  return ok;
}

bool WriteSvg(const std::string &path, const std::vector<PlacedMesh> &meshes, const ClashReport &report, int axis,
              std::string &error)
{
  // Seen along the axis: the other two coordinates, keeping a right-handed picture, with y up.
  const int u = (axis + 1) % 3, w = (axis + 2) % 3;
  std::vector<std::vector<std::array<double, 3>>> placed;
  double lo[2] = {HUGE_VAL, HUGE_VAL}, hi[2] = {-HUGE_VAL, -HUGE_VAL};
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
  const double size = 1000.0, margin = 20.0;
  const double span = std::max({hi[0] - lo[0], hi[1] - lo[1], 1e-300});
  const double scale = (size - 2 * margin) / span;
  auto X = [&](const std::array<double, 3> &p) { return margin + (p[u] - lo[0]) * scale; };
  auto Y = [&](const std::array<double, 3> &p) { return size - margin - (p[w] - lo[1]) * scale; };

  FILE *f = std::fopen(path.c_str(), "w");
  if (!f)
  {
    error = path + ": cannot be written";
    return false;
  }
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
  const bool ok = std::fclose(f) == 0;
  if (!ok)
    error = path + ": writing failed";
  return ok;
}
} // namespace rkmclash
