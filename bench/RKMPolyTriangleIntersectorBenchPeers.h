#pragma once

// How many of n packed triangle pairs (18 doubles each) CGAL's exact test finds intersecting.
long CgalTriangleTriangleSum(const double *pairs, int n);
