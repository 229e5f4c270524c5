#pragma once

#include <array>
#include <utility>
#include <vector>

// Placed triangles of one mesh, as every method of the clash benchmark sees them.
struct BenchSoup
{
  std::vector<std::array<double, 3>> vertices;
  std::vector<std::array<int, 3>> triangles;
};

// One triangle pair found meeting: meshes i < j and a triangle of each.
struct BenchContact
{
  int i, j, ti, tj;
  bool operator<(const BenchContact &o) const
  {
    return i != o.i ? i < o.i : j != o.j ? j < o.j : ti != o.ti ? ti < o.ti : tj < o.tj;
  }
  bool operator==(const BenchContact &o) const { return i == o.i && j == o.j && ti == o.ti && tj == o.tj; }
};

// One method's answer for a scene: its times and the triangle pairs of every two meshes it finds
// meeting.
struct BenchPeerResult
{
  double buildSeconds = 0.0, querySeconds = 0.0;
  std::vector<BenchContact> contacts;
};

// CGAL: box_intersection_d over every two meshes' triangle boxes (made once per mesh), with the exact-predicates
// do_intersect(Triangle_3, Triangle_3) in the callback. Degenerate triangles, which that test
// refuses, are left out (they meet nothing in the other methods either).
BenchPeerResult CgalClash(const std::vector<BenchSoup> &scene);

// FCL: BVHModel over each mesh (OBBRSS or AABB), collide for every two meshes with one contact per
// triangle pair.
// Floating point: its answers may differ from the exact ones.
BenchPeerResult FclClash(const std::vector<BenchSoup> &scene, bool obbrss);
