#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>
#include <CGAL/intersections.h>

#include "RKMPolyTriangleIntersectorBenchPeers.h"

using K = CGAL::Exact_predicates_inexact_constructions_kernel;

// The loop lives here so that CGAL's test is inlined into it, as in a CGAL program.
long CgalTriangleTriangleSum(const double *pairs, int n)
{
  long s = 0;
  for (int i = 0; i < n; ++i)
  {
    const double *q = pairs + 18 * i;
    const K::Triangle_3 t1(K::Point_3(q[0], q[1], q[2]), K::Point_3(q[3], q[4], q[5]), K::Point_3(q[6], q[7], q[8]));
    const K::Triangle_3 t2(K::Point_3(q[9], q[10], q[11]), K::Point_3(q[12], q[13], q[14]),
                           K::Point_3(q[15], q[16], q[17]));
    s += CGAL::do_intersect(t1, t2) ? 1 : 0;
  }
  return s;
}
