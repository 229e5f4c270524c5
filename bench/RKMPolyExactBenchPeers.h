#pragma once

// Peer entry points for the exact predicate benchmark.

// Shewchuk's predicates as built into TetGen's library; its header declares only some of them.
void exactinit(int, int, int, double, double, double);
double orient2d(double *pa, double *pb, double *pc);
double orient3d(double *pa, double *pb, double *pc, double *pd);

// CGAL's filtered predicates: the sum of the signs over n packed point groups, and one 3D sign
// (CGAL's 3D orientation is the opposite of Shewchuk's).
long CgalOrientation3Sum(const double *quads, int n);
long CgalOrientation2Sum(const double *triples, int n);
int CgalOrientation3(const double *a, const double *b, const double *c, const double *d);
