// CGAL's AABB tree built over one small triangle per box, for the builder benchmark. Kept in a file of
// its own: CGAL's headers are slow to compile.
#include <CGAL/AABB_traits.h>
#include <CGAL/AABB_tree.h>
#include <CGAL/AABB_triangle_primitive.h>
#include <CGAL/Simple_cartesian.h>

#include <vector>

namespace
{
typedef CGAL::Simple_cartesian<double> K;
typedef K::Triangle_3 Triangle;
typedef std::vector<Triangle>::const_iterator Iterator;
typedef CGAL::AABB_triangle_primitive<K, Iterator> Primitive;
typedef CGAL::AABB_tree<CGAL::AABB_traits<K, Primitive>> Tree;
}

// Builds the tree over triangles (x0, y0, z0, x1, …) and gives a checksum so the work is not removed.
double RKMBenchBuildCGALTree(const std::vector<double> &corners)
{
  std::vector<Triangle> triangles;
  triangles.reserve(corners.size() / 9);
  for (size_t i = 0; i + 9 <= corners.size(); i += 9)
    triangles.emplace_back(K::Point_3(corners[i], corners[i + 1], corners[i + 2]),
                           K::Point_3(corners[i + 3], corners[i + 4], corners[i + 5]),
                           K::Point_3(corners[i + 6], corners[i + 7], corners[i + 8]));
  Tree tree(triangles.begin(), triangles.end());
  tree.build();
  return tree.bbox().xmax() + static_cast<double>(tree.size());
}
