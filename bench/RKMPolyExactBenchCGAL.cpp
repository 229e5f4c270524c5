#include <CGAL/Exact_predicates_inexact_constructions_kernel.h>

#include "RKMPolyExactBenchPeers.h"

using K = CGAL::Exact_predicates_inexact_constructions_kernel;

// The loops live here so that CGAL's predicates are inlined into them, as in a CGAL program.
long CgalOrientation3Sum(const double *quads, int n)
{
  long s = 0;
  for (int i = 0; i < n; ++i)
  {
    const double *q = quads + 12 * i;
    const K::Point_3 a(q[0], q[1], q[2]), b(q[3], q[4], q[5]), c(q[6], q[7], q[8]), d(q[9], q[10], q[11]);
    s += static_cast<int>(CGAL::orientation(a, b, c, d));
  }
  return s;
}

long CgalOrientation2Sum(const double *triples, int n)
{
  long s = 0;
  for (int i = 0; i < n; ++i)
  {
    const double *q = triples + 6 * i;
    const K::Point_2 a(q[0], q[1]), b(q[2], q[3]), c(q[4], q[5]);
    s += static_cast<int>(CGAL::orientation(a, b, c));
  }
  return s;
}

int CgalOrientation3(const double *a, const double *b, const double *c, const double *d)
{
  return static_cast<int>(CGAL::orientation(K::Point_3(a[0], a[1], a[2]), K::Point_3(b[0], b[1], b[2]),
                                            K::Point_3(c[0], c[1], c[2]), K::Point_3(d[0], d[1], d[2])));
}
