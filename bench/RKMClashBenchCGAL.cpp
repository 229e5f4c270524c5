#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>
#include <CGAL/box_intersection_d.h>
#include <CGAL/intersections.h>

#include <chrono>

#include "RKMClashBenchPeers.h"

namespace
{
using K = CGAL::Exact_predicates_inexact_constructions_kernel;
using Box = CGAL::Box_intersection_d::Box_with_info_d<double, 3, int>;

std::vector<K::Triangle_3> Triangles(const BenchSoup &s)
{
  std::vector<K::Triangle_3> out;
  out.reserve(s.triangles.size());
  for (const auto &t : s.triangles)
  {
    const auto &p = s.vertices[static_cast<size_t>(t[0])], &q = s.vertices[static_cast<size_t>(t[1])],
               &r = s.vertices[static_cast<size_t>(t[2])];
    out.emplace_back(K::Point_3(p[0], p[1], p[2]), K::Point_3(q[0], q[1], q[2]), K::Point_3(r[0], r[1], r[2]));
  }
  return out;
}

std::vector<Box> Boxes(const std::vector<K::Triangle_3> &tris)
{
  std::vector<Box> boxes;
  boxes.reserve(tris.size());
  for (size_t i = 0; i < tris.size(); ++i)
    if (!tris[i].is_degenerate())
      boxes.emplace_back(tris[i].bbox(), static_cast<int>(i));
  return boxes;
}
} // namespace

BenchPeerResult CgalClash(const std::vector<BenchSoup> &scene)
{
  BenchPeerResult r;
  const auto t0 = std::chrono::steady_clock::now();
  std::vector<std::vector<K::Triangle_3>> tris;
  std::vector<std::vector<Box>> boxes;
  for (const BenchSoup &s : scene)
  {
    tris.push_back(Triangles(s));
    boxes.push_back(Boxes(tris.back()));
  }
  const auto t1 = std::chrono::steady_clock::now();
  for (size_t i = 0; i < scene.size(); ++i)
    for (size_t j = i + 1; j < scene.size(); ++j)
    {
      const auto &ti = tris[i], &tj = tris[j];
      CGAL::box_intersection_d(boxes[i].begin(), boxes[i].end(), boxes[j].begin(), boxes[j].end(),
                               [&](const Box &x, const Box &y) {
                                 if (CGAL::do_intersect(ti[static_cast<size_t>(x.info())],
                                                        tj[static_cast<size_t>(y.info())]))
                                   r.contacts.push_back(
                                       {static_cast<int>(i), static_cast<int>(j), x.info(), y.info()});
                               });
    }
  const auto t2 = std::chrono::steady_clock::now();
  r.buildSeconds = std::chrono::duration<double>(t1 - t0).count();
  r.querySeconds = std::chrono::duration<double>(t2 - t1).count();
  return r;
}
