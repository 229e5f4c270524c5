#pragma once

/// Exact-sign orientation and in-circle tests on arbitrary doubles by adaptive floating-point
/// expansion arithmetic: a cheap estimate whose error bound usually settles the sign, then
/// progressively more exact stages only when it does not. Allocates nothing; every expansion lives
/// in a fixed local array. Must be compiled without floating-point contraction.
class RKMPolyAdaptivePredicates
{
public:
  RKMPolyAdaptivePredicates();

  /// Positive when pa, pb, pc run counter-clockwise; each pointer addresses x, y.
  double orient2d(const double *pa, const double *pb, const double *pc) const;
  /// Positive when pd lies below the plane of pa, pb, pc, these running counter-clockwise seen
  /// from above; each pointer addresses x, y, z.
  double orient3d(const double *pa, const double *pb, const double *pc, const double *pd) const;
  /// Positive when pd lies inside the circle through pa, pb, pc, these running counter-clockwise.
  double incircle(const double *pa, const double *pb, const double *pc, const double *pd) const;

  double epsilon;
  double splitter;
  double resulterrbound;
  double ccwerrboundA, ccwerrboundB, ccwerrboundC;
  double o3derrboundA, o3derrboundB, o3derrboundC;
  double iccerrboundA, iccerrboundB, iccerrboundC;

private:
  // The stages after the first filter, kept out of line so the filters inline into their callers.
  // Inputs outside the range where expansions stay exact go to the integer fallback.
  [[gnu::noinline]] double orient2dadapt(const double *pa, const double *pb, const double *pc, double detsum) const;
  [[gnu::noinline]] double orient3dadapt(const double *pa, const double *pb, const double *pc, const double *pd,
                       double permanent) const;
  [[gnu::noinline]] double incircleadapt(const double *pa, const double *pb, const double *pc, const double *pd,
                       double permanent) const;
};
