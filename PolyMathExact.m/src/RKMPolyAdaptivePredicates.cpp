// The adaptive kernel (expansion arithmetic and its three predicates), and the members of
// RKMPolyExactArithmetic that call it, kept beside it so that its filters inline into them.

#include "RKMPolyAdaptivePredicates.h"

#include <cmath>

#include "RKMPolyExactArithmetic.h"
#include "RKMPolyExactBigSign.h"

// Expansion arithmetic: a value is held exactly as a sum of doubles of increasing magnitude that do
// not overlap. Every primitive below relies on each operation being rounded to nearest on its own;
// a fused multiply-add in Split would leave a high half of more than 26 bits and break TwoProduct.

namespace
{

// Below this a product may have underflowed; shortcuts taken on smaller values are not trusted.
constexpr double kUnderflowGuard = 0x1p-900;

inline void TwoSum(double a, double b, double &x, double &y)
{
  x = a + b;
  const double bv = x - a;
  const double av = x - bv;
  const double br = b - bv;
  const double ar = a - av;
  y = ar + br;
}

// Valid when |a| >= |b| or a is zero.
inline void FastTwoSum(double a, double b, double &x, double &y)
{
  x = a + b;
  const double bv = x - a;
  y = b - bv;
}

inline double TwoDiffTail(double a, double b, double x)
{
  const double bv = a - x;
  const double av = x + bv;
  const double br = bv - b;
  const double ar = a - av;
  return ar + br;
}

inline void TwoDiff(double a, double b, double &x, double &y)
{
  x = a - b;
  y = TwoDiffTail(a, b, x);
}

// a = hi + lo with hi and lo of at most 26 significant bits each, so that products of halves are
// exact.
inline void Split(double a, double splitter, double &hi, double &lo)
{
  const double c = splitter * a;
  const double abig = c - a;
  hi = c - abig;
  lo = a - hi;
}

inline void TwoProductPresplit(double a, double b, double bhi, double blo, double splitter, double &x, double &y)
{
  x = a * b;
  double ahi, alo;
  Split(a, splitter, ahi, alo);
  const double err1 = x - ahi * bhi;
  const double err2 = err1 - alo * bhi;
  const double err3 = err2 - ahi * blo;
  y = alo * blo - err3;
}

inline void TwoProduct(double a, double b, double splitter, double &x, double &y)
{
  double bhi, blo;
  Split(b, splitter, bhi, blo);
  TwoProductPresplit(a, b, bhi, blo, splitter, x, y);
}

// (a1 + a0) − b = x2 + x1 + x0.
inline void TwoOneDiff(double a1, double a0, double b, double &x2, double &x1, double &x0)
{
  double i;
  TwoDiff(a0, b, i, x0);
  TwoSum(a1, i, x2, x1);
}

// (a1 + a0) − (b1 + b0) as four components, smallest first.
inline void TwoTwoDiff(double a1, double a0, double b1, double b0, double *x)
{
  double j, z;
  TwoOneDiff(a1, a0, b0, j, z, x[0]);
  TwoOneDiff(j, z, b1, x[3], x[2], x[1]);
}

// h = e + f with zero components removed; h needs elen + flen slots; at least one component is kept.
int ExpansionSum(int elen, const double *e, int flen, const double *f, double *h)
{
  int ei = 0, fi = 0, hi = 0;
  double enow = e[0], fnow = f[0];
  double Q, Qnew, hh;
  // The smaller of the two current components goes first; the index is advanced without reading
  // past the end of either expansion.
  auto takeE = [&](void) {
    const double v = enow;
    if (++ei < elen)
      enow = e[ei];
    return v;
  };
  auto takeF = [&](void) {
    const double v = fnow;
    if (++fi < flen)
      fnow = f[fi];
    return v;
  };
  auto eFirst = [&](void) { return (fnow > enow) == (fnow > -enow); };

  Q = eFirst() ? takeE() : takeF();
  if (ei < elen && fi < flen)
  {
    const double g = eFirst() ? takeE() : takeF();
    FastTwoSum(g, Q, Qnew, hh);
    Q = Qnew;
    if (hh != 0.0)
      h[hi++] = hh;
    while (ei < elen && fi < flen)
    {
      const double g2 = eFirst() ? takeE() : takeF();
      TwoSum(Q, g2, Qnew, hh);
      Q = Qnew;
      if (hh != 0.0)
        h[hi++] = hh;
    }
  }
  while (ei < elen)
  {
    TwoSum(Q, takeE(), Qnew, hh);
    Q = Qnew;
    if (hh != 0.0)
      h[hi++] = hh;
  }
  while (fi < flen)
  {
    TwoSum(Q, takeF(), Qnew, hh);
    Q = Qnew;
    if (hh != 0.0)
      h[hi++] = hh;
  }
  if (Q != 0.0 || hi == 0)
    h[hi++] = Q;
  return hi;
}

// h = b·e with zero components removed; h needs 2·elen slots.
int ScaleExpansion(int elen, const double *e, double b, double splitter, double *h)
{
  double bhi, blo;
  Split(b, splitter, bhi, blo);
  double Q, hh;
  TwoProductPresplit(e[0], b, bhi, blo, splitter, Q, hh);
  int hi = 0;
  if (hh != 0.0)
    h[hi++] = hh;
  for (int i = 1; i < elen; ++i)
  {
    double p1, p0, sum;
    TwoProductPresplit(e[i], b, bhi, blo, splitter, p1, p0);
    TwoSum(Q, p0, sum, hh);
    if (hh != 0.0)
      h[hi++] = hh;
    FastTwoSum(p1, sum, Q, hh);
    if (hh != 0.0)
      h[hi++] = hh;
  }
  if (Q != 0.0 || hi == 0)
    h[hi++] = Q;
  return hi;
}

double Estimate(int elen, const double *e)
{
  double q = e[0];
  for (int i = 1; i < elen; ++i)
    q += e[i];
  return q;
}

void Negate(int elen, double *e)
{
  for (int i = 0; i < elen; ++i)
    e[i] = -e[i];
}

// The exact difference a − b as an expansion of one or two components.
int ExactDiff(double a, double b, double *h)
{
  double x, y;
  TwoDiff(a, b, x, y);
  if (y == 0.0)
  {
    h[0] = x;
    return 1;
  }
  h[0] = y;
  h[1] = x;
  return 2;
}

// h = e·f; h needs 2·elen·flen slots. Used only by the last, exact stages, where the inputs are at
// most 16 components long.
constexpr int kMaxFactor = 16;
int MultiplyExpansions(int elen, const double *e, int flen, const double *f, double splitter, double *h)
{
  double scaled[2 * kMaxFactor];
  double acc[2][2 * kMaxFactor * kMaxFactor];
  int len = ScaleExpansion(elen, e, f[0], splitter, acc[0]);
  int cur = 0;
  for (int i = 1; i < flen; ++i)
  {
    const int slen = ScaleExpansion(elen, e, f[i], splitter, scaled);
    len = ExpansionSum(len, acc[cur], slen, scaled, acc[1 - cur]);
    cur = 1 - cur;
  }
  for (int i = 0; i < len; ++i)
    h[i] = acc[cur][i];
  return len;
}

// Exact (bx·cy − by·cx) from two-component coordinate differences; h needs 16 slots.
int ExactMinor(int bxl, const double *bx, int cyl, const double *cy, int byl, const double *by, int cxl,
               const double *cx, double splitter, double *h)
{
  double p[8], q[8];
  const int pl = MultiplyExpansions(bxl, bx, cyl, cy, splitter, p);
  const int ql = MultiplyExpansions(byl, by, cxl, cx, splitter, q);
  Negate(ql, q);
  return ExpansionSum(pl, p, ql, q, h);
}

struct ExactDiffs
{
  double v[2];
  int n;
};

} // namespace

RKMPolyAdaptivePredicates::RKMPolyAdaptivePredicates()
{
  // The largest power of two that leaves 1 + epsilon rounding to 1, and the splitter 2^ceil(p/2) + 1
  // that halves a p-bit mantissa; found by probing the arithmetic rather than assumed.
  bool everyOther = true;
  double check = 1.0, lastcheck;
  epsilon = 1.0;
  splitter = 1.0;
  do
  {
    lastcheck = check;
    epsilon *= 0.5;
    if (everyOther)
      splitter *= 2.0;
    everyOther = !everyOther;
    check = 1.0 + epsilon;
  } while (check != 1.0 && check != lastcheck);
  splitter += 1.0;

  resulterrbound = (3.0 + 8.0 * epsilon) * epsilon;
  ccwerrboundA = (3.0 + 16.0 * epsilon) * epsilon;
  ccwerrboundB = (2.0 + 12.0 * epsilon) * epsilon;
  ccwerrboundC = (9.0 + 64.0 * epsilon) * epsilon * epsilon;
  o3derrboundA = (7.0 + 56.0 * epsilon) * epsilon;
  o3derrboundB = (3.0 + 28.0 * epsilon) * epsilon;
  o3derrboundC = (26.0 + 288.0 * epsilon) * epsilon * epsilon;
  iccerrboundA = (10.0 + 96.0 * epsilon) * epsilon;
  iccerrboundB = (4.0 + 48.0 * epsilon) * epsilon;
  iccerrboundC = (44.0 + 576.0 * epsilon) * epsilon * epsilon;
}

inline double RKMPolyAdaptivePredicates::orient2d(const double *pa, const double *pb, const double *pc) const
{
  const double acx = pa[0] - pc[0], bcy = pb[1] - pc[1], acy = pa[1] - pc[1], bcx = pb[0] - pc[0];
  const double detleft = acx * bcy;
  const double detright = acy * bcx;
  const double det = detleft - detright;
  // When the two products have opposite signs, or one is zero, |det| is detsum itself and passes
  // the bound: one test covers every shortcut, with one predictable branch. It is trusted only well
  // above the subnormal range, where a product that underflowed cannot have lost anything that
  // matters; an overflow gives inf or NaN, which it never accepts.
  const double detsum = std::fabs(detleft) + std::fabs(detright);
  if (std::fabs(det) >= ccwerrboundA * detsum && detsum >= kUnderflowGuard)
    return det;
  // Both products vanish through a zero factor, as on axis-aligned input: exactly zero.
  if (detsum == 0.0 && (acx == 0.0 || bcy == 0.0) && (acy == 0.0 || bcx == 0.0))
    return 0.0;
  return orient2dadapt(pa, pb, pc, detsum);
}

double RKMPolyAdaptivePredicates::orient2dadapt(const double *pa, const double *pb, const double *pc,
                                                double detsum) const
{
  // Outside the safe range the expansions could overflow or lose error terms to underflow.
  if (!RKMPolyExactBigSign::InSafeRange(pa, 2) || !RKMPolyExactBigSign::InSafeRange(pb, 2) ||
      !RKMPolyExactBigSign::InSafeRange(pc, 2))
  {
    const double *in[6] = {&pa[0], &pa[1], &pb[0], &pb[1], &pc[0], &pc[1]};
    double s[6];
    if (RKMPolyExactBigSign::ScaleIntoSafeRange(in, 6, s))
      return orient2d(s, s + 2, s + 4);
    return RKMPolyExactBigSign::Orient2D(pa, pb, pc);
  }
  const double acx = pa[0] - pc[0];
  const double bcx = pb[0] - pc[0];
  const double acy = pa[1] - pc[1];
  const double bcy = pb[1] - pc[1];

  double detleft, detlefttail, detright, detrighttail;
  TwoProduct(acx, bcy, splitter, detleft, detlefttail);
  TwoProduct(acy, bcx, splitter, detright, detrighttail);
  double B[4];
  TwoTwoDiff(detleft, detlefttail, detright, detrighttail, B);

  double det = Estimate(4, B);
  double errbound = ccwerrboundB * detsum;
  if (det >= errbound || -det >= errbound)
    return det;

  const double acxtail = TwoDiffTail(pa[0], pc[0], acx);
  const double bcxtail = TwoDiffTail(pb[0], pc[0], bcx);
  const double acytail = TwoDiffTail(pa[1], pc[1], acy);
  const double bcytail = TwoDiffTail(pb[1], pc[1], bcy);
  if (acxtail == 0.0 && acytail == 0.0 && bcxtail == 0.0 && bcytail == 0.0)
    return det;

  errbound = ccwerrboundC * detsum + resulterrbound * std::fabs(det);
  det += (acx * bcytail + bcy * acxtail) - (acy * bcxtail + bcx * acytail);
  if (det >= errbound || -det >= errbound)
    return det;

  double s1, s0, t1, t0, u[4];
  double C1[8], C2[12], D[16];
  TwoProduct(acxtail, bcy, splitter, s1, s0);
  TwoProduct(acytail, bcx, splitter, t1, t0);
  TwoTwoDiff(s1, s0, t1, t0, u);
  const int c1len = ExpansionSum(4, B, 4, u, C1);

  TwoProduct(acx, bcytail, splitter, s1, s0);
  TwoProduct(acy, bcxtail, splitter, t1, t0);
  TwoTwoDiff(s1, s0, t1, t0, u);
  const int c2len = ExpansionSum(c1len, C1, 4, u, C2);

  TwoProduct(acxtail, bcytail, splitter, s1, s0);
  TwoProduct(acytail, bcxtail, splitter, t1, t0);
  TwoTwoDiff(s1, s0, t1, t0, u);
  const int dlen = ExpansionSum(c2len, C2, 4, u, D);
  return D[dlen - 1];
}

inline double RKMPolyAdaptivePredicates::orient3d(const double *pa, const double *pb, const double *pc,
                                           const double *pd) const
{
  const double adx = pa[0] - pd[0], bdx = pb[0] - pd[0], cdx = pc[0] - pd[0];
  const double ady = pa[1] - pd[1], bdy = pb[1] - pd[1], cdy = pc[1] - pd[1];
  const double adz = pa[2] - pd[2], bdz = pb[2] - pd[2], cdz = pc[2] - pd[2];

  const double bdxcdy = bdx * cdy, cdxbdy = cdx * bdy;
  const double cdxady = cdx * ady, adxcdy = adx * cdy;
  const double adxbdy = adx * bdy, bdxady = bdx * ady;

  const double det = adz * (bdxcdy - cdxbdy) + bdz * (cdxady - adxcdy) + cdz * (adxbdy - bdxady);
  const double permanent = (std::fabs(bdxcdy) + std::fabs(cdxbdy)) * std::fabs(adz) +
                           (std::fabs(cdxady) + std::fabs(adxcdy)) * std::fabs(bdz) +
                           (std::fabs(adxbdy) + std::fabs(bdxady)) * std::fabs(cdz);
  const double errbound = o3derrboundA * permanent;
  // A product that underflowed lost at most 2^-1075, then scaled by a z difference: far below the
  // slack of the bound when the permanent clears this floor. Overflows give inf or NaN, never a
  // decision.
  if (std::fabs(det) > errbound &&
      permanent >= 0x1p-960 * (1.0 + std::fabs(adz) + std::fabs(bdz) + std::fabs(cdz)))
    return det;
  return orient3dadapt(pa, pb, pc, pd, permanent);
}

double RKMPolyAdaptivePredicates::orient3dadapt(const double *pa, const double *pb, const double *pc,
                                                const double *pd, double permanent) const
{
  if (!RKMPolyExactBigSign::InSafeRange(pa, 3) || !RKMPolyExactBigSign::InSafeRange(pb, 3) ||
      !RKMPolyExactBigSign::InSafeRange(pc, 3) || !RKMPolyExactBigSign::InSafeRange(pd, 3))
  {
    const double *in[12] = {&pa[0], &pa[1], &pa[2], &pb[0], &pb[1], &pb[2],
                            &pc[0], &pc[1], &pc[2], &pd[0], &pd[1], &pd[2]};
    double s[12];
    if (RKMPolyExactBigSign::ScaleIntoSafeRange(in, 12, s))
      return orient3d(s, s + 3, s + 6, s + 9);
    return -RKMPolyExactBigSign::Orient3D(pa, pb, pc, pd);
  }
  const double adx = pa[0] - pd[0], bdx = pb[0] - pd[0], cdx = pc[0] - pd[0];
  const double ady = pa[1] - pd[1], bdy = pb[1] - pd[1], cdy = pc[1] - pd[1];
  const double adz = pa[2] - pd[2], bdz = pb[2] - pd[2], cdz = pc[2] - pd[2];

  double p1, p0, q1, q0;
  double bc[4], ca[4], ab[4];
  TwoProduct(bdx, cdy, splitter, p1, p0);
  TwoProduct(cdx, bdy, splitter, q1, q0);
  TwoTwoDiff(p1, p0, q1, q0, bc);
  TwoProduct(cdx, ady, splitter, p1, p0);
  TwoProduct(adx, cdy, splitter, q1, q0);
  TwoTwoDiff(p1, p0, q1, q0, ca);
  TwoProduct(adx, bdy, splitter, p1, p0);
  TwoProduct(bdx, ady, splitter, q1, q0);
  TwoTwoDiff(p1, p0, q1, q0, ab);

  double adet[8], bdet[8], cdet[8], abdet[16], fin[24];
  const int alen = ScaleExpansion(4, bc, adz, splitter, adet);
  const int blen = ScaleExpansion(4, ca, bdz, splitter, bdet);
  const int clen = ScaleExpansion(4, ab, cdz, splitter, cdet);
  const int ablen = ExpansionSum(alen, adet, blen, bdet, abdet);
  const int finlen = ExpansionSum(ablen, abdet, clen, cdet, fin);

  double det = Estimate(finlen, fin);
  double errbound = o3derrboundB * permanent;
  if (det >= errbound || -det >= errbound)
    return det;

  const double adxtail = TwoDiffTail(pa[0], pd[0], adx);
  const double bdxtail = TwoDiffTail(pb[0], pd[0], bdx);
  const double cdxtail = TwoDiffTail(pc[0], pd[0], cdx);
  const double adytail = TwoDiffTail(pa[1], pd[1], ady);
  const double bdytail = TwoDiffTail(pb[1], pd[1], bdy);
  const double cdytail = TwoDiffTail(pc[1], pd[1], cdy);
  const double adztail = TwoDiffTail(pa[2], pd[2], adz);
  const double bdztail = TwoDiffTail(pb[2], pd[2], bdz);
  const double cdztail = TwoDiffTail(pc[2], pd[2], cdz);
  if (adxtail == 0.0 && bdxtail == 0.0 && cdxtail == 0.0 && adytail == 0.0 && bdytail == 0.0 &&
      cdytail == 0.0 && adztail == 0.0 && bdztail == 0.0 && cdztail == 0.0)
    return det;

  errbound = o3derrboundC * permanent + resulterrbound * std::fabs(det);
  det += (adz * ((bdx * cdytail + cdy * bdxtail) - (bdy * cdxtail + cdx * bdytail)) +
          adztail * (bdx * cdy - bdy * cdx)) +
         (bdz * ((cdx * adytail + ady * cdxtail) - (cdy * adxtail + adx * cdytail)) +
          bdztail * (cdx * ady - cdy * adx)) +
         (cdz * ((adx * bdytail + bdy * adxtail) - (ady * bdxtail + bdx * adytail)) +
          cdztail * (adx * bdy - ady * bdx));
  if (det >= errbound || -det >= errbound)
    return det;

  // Last stage: the whole determinant over the exact differences, head and tail alike. Rarely
  // reached, so it favours plainness over reuse of the partial sums above.
  ExactDiffs d[3][3];
  const double *pts[3] = {pa, pb, pc};
  for (int i = 0; i < 3; ++i)
    for (int k = 0; k < 3; ++k)
      d[i][k].n = ExactDiff(pts[i][k], pd[k], d[i][k].v);

  double terms[3][64];
  int tlen[3];
  for (int i = 0; i < 3; ++i)
  {
    const ExactDiffs *u = d[i], *v = d[(i + 1) % 3], *w = d[(i + 2) % 3];
    double minor[16];
    const int mlen = ExactMinor(v[0].n, v[0].v, w[1].n, w[1].v, v[1].n, v[1].v, w[0].n, w[0].v, splitter, minor);
    tlen[i] = MultiplyExpansions(mlen, minor, u[2].n, u[2].v, splitter, terms[i]);
  }
  double sum01[128], total[192];
  const int l01 = ExpansionSum(tlen[0], terms[0], tlen[1], terms[1], sum01);
  const int ltot = ExpansionSum(l01, sum01, tlen[2], terms[2], total);
  return total[ltot - 1];
}

inline double RKMPolyAdaptivePredicates::incircle(const double *pa, const double *pb, const double *pc,
                                           const double *pd) const
{
  const double adx = pa[0] - pd[0], bdx = pb[0] - pd[0], cdx = pc[0] - pd[0];
  const double ady = pa[1] - pd[1], bdy = pb[1] - pd[1], cdy = pc[1] - pd[1];

  const double bdxcdy = bdx * cdy, cdxbdy = cdx * bdy;
  const double alift = adx * adx + ady * ady;
  const double cdxady = cdx * ady, adxcdy = adx * cdy;
  const double blift = bdx * bdx + bdy * bdy;
  const double adxbdy = adx * bdy, bdxady = bdx * ady;
  const double clift = cdx * cdx + cdy * cdy;

  const double det = alift * (bdxcdy - cdxbdy) + blift * (cdxady - adxcdy) + clift * (adxbdy - bdxady);
  const double permanent = (std::fabs(bdxcdy) + std::fabs(cdxbdy)) * alift +
                           (std::fabs(cdxady) + std::fabs(adxcdy)) * blift +
                           (std::fabs(adxbdy) + std::fabs(bdxady)) * clift;
  const double errbound = iccerrboundA * permanent;
  // As in orient3d: underflowed products are scaled by a lift or a minor at most.
  const double scale = 1.0 + alift + blift + clift + std::fabs(bdxcdy) + std::fabs(cdxbdy) + std::fabs(cdxady) +
                       std::fabs(adxcdy) + std::fabs(adxbdy) + std::fabs(bdxady);
  if (std::fabs(det) > errbound && permanent >= 0x1p-960 * scale)
    return det;
  return incircleadapt(pa, pb, pc, pd, permanent);
}

double RKMPolyAdaptivePredicates::incircleadapt(const double *pa, const double *pb, const double *pc,
                                                const double *pd, double permanent) const
{
  if (!RKMPolyExactBigSign::InSafeRange(pa, 2) || !RKMPolyExactBigSign::InSafeRange(pb, 2) ||
      !RKMPolyExactBigSign::InSafeRange(pc, 2) || !RKMPolyExactBigSign::InSafeRange(pd, 2))
  {
    const double *in[8] = {&pa[0], &pa[1], &pb[0], &pb[1], &pc[0], &pc[1], &pd[0], &pd[1]};
    double s[8];
    if (RKMPolyExactBigSign::ScaleIntoSafeRange(in, 8, s))
      return incircle(s, s + 2, s + 4, s + 6);
    return RKMPolyExactBigSign::InCircle(pa, pb, pc, pd);
  }
  const double adx = pa[0] - pd[0], bdx = pb[0] - pd[0], cdx = pc[0] - pd[0];
  const double ady = pa[1] - pd[1], bdy = pb[1] - pd[1], cdy = pc[1] - pd[1];

  // Each lifted term: (x² + y²)·minor, over the rounded differences, as an exact expansion.
  auto liftedTerm = [this](double x, double y, double m1a, double m1b, double m2a, double m2b, double *out) {
    double p1, p0, q1, q0, minor[4];
    TwoProduct(m1a, m1b, splitter, p1, p0);
    TwoProduct(m2a, m2b, splitter, q1, q0);
    TwoTwoDiff(p1, p0, q1, q0, minor);
    double xm[8], xxm[16], ym[8], yym[16];
    const int xl = ScaleExpansion(4, minor, x, splitter, xm);
    const int xxl = ScaleExpansion(xl, xm, x, splitter, xxm);
    const int yl = ScaleExpansion(4, minor, y, splitter, ym);
    const int yyl = ScaleExpansion(yl, ym, y, splitter, yym);
    return ExpansionSum(xxl, xxm, yyl, yym, out);
  };
  double adet[32], bdet[32], cdet[32], abdet[64], fin[96];
  const int alen = liftedTerm(adx, ady, bdx, cdy, cdx, bdy, adet);
  const int blen = liftedTerm(bdx, bdy, cdx, ady, adx, cdy, bdet);
  const int clen = liftedTerm(cdx, cdy, adx, bdy, bdx, ady, cdet);
  const int ablen = ExpansionSum(alen, adet, blen, bdet, abdet);
  const int finlen = ExpansionSum(ablen, abdet, clen, cdet, fin);

  double det = Estimate(finlen, fin);
  double errbound = iccerrboundB * permanent;
  if (det >= errbound || -det >= errbound)
    return det;

  const double adxtail = TwoDiffTail(pa[0], pd[0], adx);
  const double adytail = TwoDiffTail(pa[1], pd[1], ady);
  const double bdxtail = TwoDiffTail(pb[0], pd[0], bdx);
  const double bdytail = TwoDiffTail(pb[1], pd[1], bdy);
  const double cdxtail = TwoDiffTail(pc[0], pd[0], cdx);
  const double cdytail = TwoDiffTail(pc[1], pd[1], cdy);
  if (adxtail == 0.0 && bdxtail == 0.0 && cdxtail == 0.0 && adytail == 0.0 && bdytail == 0.0 &&
      cdytail == 0.0)
    return det;

  errbound = iccerrboundC * permanent + resulterrbound * std::fabs(det);
  det += ((adx * adx + ady * ady) * ((bdx * cdytail + cdy * bdxtail) - (bdy * cdxtail + cdx * bdytail)) +
          2.0 * (adx * adxtail + ady * adytail) * (bdx * cdy - bdy * cdx)) +
         ((bdx * bdx + bdy * bdy) * ((cdx * adytail + ady * cdxtail) - (cdy * adxtail + adx * cdytail)) +
          2.0 * (bdx * bdxtail + bdy * bdytail) * (cdx * ady - cdy * adx)) +
         ((cdx * cdx + cdy * cdy) * ((adx * bdytail + bdy * adxtail) - (ady * bdxtail + bdx * adytail)) +
          2.0 * (cdx * cdxtail + cdy * cdytail) * (adx * bdy - ady * bdx));
  if (det >= errbound || -det >= errbound)
    return det;

  // Last stage: Σ (x² + y²)·(minor of the other two) over the exact differences.
  ExactDiffs d[3][2];
  const double *pts[3] = {pa, pb, pc};
  for (int i = 0; i < 3; ++i)
    for (int k = 0; k < 2; ++k)
      d[i][k].n = ExactDiff(pts[i][k], pd[k], d[i][k].v);

  double terms[3][512];
  int tlen[3];
  for (int i = 0; i < 3; ++i)
  {
    const ExactDiffs *u = d[i], *v = d[(i + 1) % 3], *w = d[(i + 2) % 3];
    double xx[8], yy[8], lift[16], minor[16];
    const int xxl = MultiplyExpansions(u[0].n, u[0].v, u[0].n, u[0].v, splitter, xx);
    const int yyl = MultiplyExpansions(u[1].n, u[1].v, u[1].n, u[1].v, splitter, yy);
    const int ll = ExpansionSum(xxl, xx, yyl, yy, lift);
    const int mlen = ExactMinor(v[0].n, v[0].v, w[1].n, w[1].v, v[1].n, v[1].v, w[0].n, w[0].v, splitter, minor);
    tlen[i] = MultiplyExpansions(mlen, minor, ll, lift, splitter, terms[i]);
  }
  double sum01[1024], total[1536];
  const int l01 = ExpansionSum(tlen[0], terms[0], tlen[1], terms[1], sum01);
  const int ltot = ExpansionSum(l01, sum01, tlen[2], terms[2], total);
  return total[ltot - 1];
}

int RKMPolyExactArithmetic::AdaptiveOrientation2D(const double *a, const double *b, const double *c) const
{
  if ((m_mode != Adaptive && m_mode != Adaptive2) || !m_kernel)
    return 0;
  const double r = m_kernel->orient2d(a, b, c);
  return (r > 0.0) - (r < 0.0);
}

int RKMPolyExactArithmetic::AdaptiveOrientation3D(const double *a, const double *b, const double *c,
                                                  const double *d) const
{
  if ((m_mode != Adaptive && m_mode != Adaptive2) || !m_kernel)
    return 0;
  // The kernel's positive side is the opposite one.
  const double r = m_kernel->orient3d(a, b, c, d);
  return (r < 0.0) - (r > 0.0);
}

int RKMPolyExactArithmetic::InCircle(const RKMMathPoint2D &a, const RKMMathPoint2D &b, const RKMMathPoint2D &c,
                                     const RKMMathPoint2D &d) const
{
  if (!m_kernel)
    return 0;
  double r = m_kernel->incircle(&a.x, &b.x, &c.x, &d.x);
  if (m_kernel->orient2d(&a.x, &b.x, &c.x) < 0.0)
    r = -r;
  return (r > 0.0) - (r < 0.0);
}
