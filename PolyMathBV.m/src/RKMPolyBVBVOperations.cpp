#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyLineBoxDistance.h"
#include "RKMPolyOBB.h"

#include "RKMMathBox.h"
#include "RKMMathConstants.h"
#include "RKMMathFloat.h"
#include "RKMMathTransformation.h"
#include "RKMTolerance.h"

#include <algorithm>
#include <cfloat>
#include <cmath>

namespace
{
typedef RKMPolyBoundingVolume BV;
constexpr double kSlack = 64 * DBL_EPSILON;

// The rank that decides which branch owns a pair: the lower-ranked kind computes, and the tolerance
// enlarges the volume of that kind (bv1 when both are of one kind).
int Rank(BV::TypeID k)
{
  switch (k)
  {
  case BV::TypeCylinder: return 0;
  case BV::TypePlane: return 1;
  case BV::TypeSphere: return 2;
  case BV::TypeAABB: return 3;
  case BV::TypeOBB: return 4;
  }
  return -1;
}

// A volume placed in the common frame, enlarged by a tolerance when it owns one.
struct Placed
{
  enum Kind { Sphere, Box, Slab, Capsule } kind = Sphere;
  bool empty = false;
  // Sphere and capsule: centre, radius; capsule: unit axis and half-length, infinite when L ≤ 0.
  RKMMathPoint c;
  double r = 0.0;
  RKMMathVector a;
  double L = 0.0;
  // Box: an oriented box, or an unplaced float box kept as such.
  RKMMathOBBBase box;
  /// An unplaced box: box is axis-aligned and fbox is its float box (when no tolerance applies).
  bool aligned = false;
  bool rawBox = false;
  RKMPolyBoxf fbox;
  // Slab.
  RKMMathVector n;
  RKMMathPoint o;
  double t = 0.0;
  bool allSpace = false;
};

// A box volume (AABB or OBB) as an oriented box placed by T and inflated by the tolerance.
RKMMathOBBBase PlacedBox(const BV &bv, const RKMMathTransformation *T, double tolerance)
{
  RKMMathOBBBase box;
  if (bv.GetTypeID() == BV::TypeAABB)
  {
    RKMMathBox m = static_cast<const RKMPolyAABB &>(bv).GetBoxf().GetMathBox();
    if (tolerance != 0.0)
      m.Inflate(tolerance);
    box = RKMMathOBBBase(m);
    if (T)
      box = *T * box;
  }
  else
  {
    box = T ? *T * static_cast<const RKMPolyOBB &>(bv).GetBase() : static_cast<const RKMPolyOBB &>(bv).GetBase();
    box.Inflate(tolerance);
  }
  return box;
}

Placed Place(const BV &bv, const RKMMathTransformation *T, double tolerance)
{
  Placed p;
  switch (bv.GetTypeID())
  {
  case BV::TypeSphere:
  {
    RKMPolyBoundingSphere s(static_cast<const RKMPolyBoundingSphere &>(bv));
    if (T)
      RKMPolyBVOperations::Transform(s, *T);
    p.kind = Placed::Sphere;
    p.c = s.GetCenter();
    p.r = s.GetRadius() + tolerance;
    p.empty = !(s.GetRadius() >= 0.0) || !(p.r >= 0.0);
    break;
  }
  case BV::TypeAABB:
  {
    const RKMPolyBoxf &f = static_cast<const RKMPolyAABB &>(bv).GetBoxf();
    p.kind = Placed::Box;
    p.empty = f.IsEmpty();
    p.aligned = !T;
    if (!T && tolerance == 0.0)
    {
      p.rawBox = true;
      p.fbox = f;
    }
    RKMMathBox m = f.GetMathBox();
    m.Inflate(tolerance);
    p.box = T ? *T * RKMMathOBBBase(m) : RKMMathOBBBase(m);
    p.empty = p.empty || !p.box.IsDefined();
    break;
  }
  case BV::TypeOBB:
  {
    const RKMPolyOBB &o = static_cast<const RKMPolyOBB &>(bv);
    p.kind = Placed::Box;
    p.box = T ? *T * o.GetBase() : o.GetBase();
    p.box.Inflate(tolerance);
    p.empty = !p.box.IsDefined();
    break;
  }
  case BV::TypePlane:
  {
    const RKMPolyBoundingPlane s = T ? *T * static_cast<const RKMPolyBoundingPlane &>(bv)
                                     : static_cast<const RKMPolyBoundingPlane &>(bv);
    p.kind = Placed::Slab;
    p.n = s.GetNormal();
    p.o = s.GetOrigin();
    p.t = s.GetThickness() + tolerance;
    p.allSpace = s.IsInfinitelyThick();
    p.empty = !p.allSpace && !(p.t >= 0.0);
    break;
  }
  case BV::TypeCylinder:
  {
    RKMPolyBoundingCylinder c(static_cast<const RKMPolyBoundingCylinder &>(bv));
    if (T)
      RKMPolyBVOperations::Transform(c, *T);
    p.kind = Placed::Capsule;
    p.c = c.GetCenter();
    p.a = c.GetDirection();
    p.r = c.GetRadius() + tolerance;
    p.L = c.GetLimit();
    p.empty = !(c.GetRadius() >= 0.0) || !(p.r >= 0.0);
    break;
  }
  }
  return p;
}

double Norm1(const RKMMathVector &v) { return std::fabs(v.x) + std::fabs(v.y) + std::fabs(v.z); }

// Squared distance between two segments or lines (half-length ≤ 0: a whole line). Convex in (s, u),
// so the minimum is the interior critical point when it is inside the domain, or lies on an edge where
// one parameter is at its bound and the other takes its clamped optimum. Each candidate is measured
// between its two points, which also serves nearly parallel axes.
double AxisAxisSquare(const RKMMathPoint &c1, const RKMMathVector &a1, double L1, const RKMMathPoint &c2,
                      const RKMMathVector &a2, double L2)
{
  const bool inf1 = !(L1 > 0.0), inf2 = !(L2 > 0.0);
  const RKMMathVector w = c2 - c1;
  const double k = a1 * a2, p = a1 * w, q = a2 * w, D = 1.0 - k * k;
  auto at = [&](double s, double u) { return (w + a2 * u - a1 * s).SquareNorm(); };
  auto clamp1 = [&](double s) { return inf1 ? s : std::fmax(-L1, std::fmin(L1, s)); };
  auto clamp2 = [&](double u) { return inf2 ? u : std::fmax(-L2, std::fmin(L2, u)); };
  // From the middle of the second axis, the nearest point of the first, then back.
  double s0 = clamp1(p), best = at(s0, clamp2(k * s0 - q));
  best = std::fmin(best, at(clamp1(p), 0.0));
  if (D > 0.0)
  {
    const double s = (p - k * q) / D, u = (k * p - q) / D;
    if (std::isfinite(s) && std::isfinite(u) && (inf1 || std::fabs(s) <= L1) && (inf2 || std::fabs(u) <= L2))
      best = std::fmin(best, at(s, u));
  }
  if (!inf1)
    for (double s : {-L1, L1})
      best = std::fmin(best, at(s, clamp2(k * s - q)));
  if (!inf2)
    for (double u : {-L2, L2})
      best = std::fmin(best, at(clamp1(p + k * u), u));
  if (inf1 && inf2 && !(D > 0.0))
    best = std::fmin(best, w.SquareNorm() - p * p);
  return std::fmax(0.0, best);
}

// The extent of a placed volume along the unit normal n, measured from o: [lo, hi]; unbounded sides are
// ±inf.
void ExtentAlong(const Placed &v, const RKMMathVector &n, const RKMMathPoint &o, double &lo, double &hi)
{
  switch (v.kind)
  {
  case Placed::Sphere:
  {
    const double s = n * (v.c - o);
    lo = s - v.r;
    hi = s + v.r;
    return;
  }
  case Placed::Box:
  {
    const double s = n * (v.box.Center() - o);
    double e = 0.0;
    for (int i = 0; i < 3; ++i)
      e += v.box.Diagonal()[i] * std::fabs(n * v.box.Axis(i));
    lo = s - e;
    hi = s + e;
    return;
  }
  case Placed::Capsule:
  {
    const double s = n * (v.c - o), k = std::fabs(n * v.a);
    if (!(v.L > 0.0) && k > 0.0)
    {
      lo = -HUGE_VAL;
      hi = HUGE_VAL;
      return;
    }
    const double e = (v.L > 0.0 ? k * v.L : 0.0) + v.r;
    lo = s - e;
    hi = s + e;
    return;
  }
  case Placed::Slab:
  {
    const double s = n * (v.o - o);
    if (v.allSpace || (n ^ v.n).SquareNorm() > 1e-30)
    {
      lo = -HUGE_VAL;
      hi = HUGE_VAL;
      return;
    }
    lo = s - v.t;
    hi = s + v.t;
    return;
  }
  }
}

// The minimum distance between two placed volumes (owner first), never above the true one; 0 when
// they overlap.
double MinDistance(const Placed &x, const Placed &y)
{
  if (x.kind == Placed::Slab || y.kind == Placed::Slab)
  {
    const Placed &s = x.kind == Placed::Slab ? x : y;
    const Placed &other = x.kind == Placed::Slab ? y : x;
    if (s.allSpace)
      return 0.0;
    double lo = 0.0, hi = 0.0;
    ExtentAlong(other, s.n, s.o, lo, hi);
    const double slack = kSlack * (Norm1(s.o.AsVector()) + s.t + std::fabs(lo) + std::fabs(hi));
    const double gap = std::fmax(lo - s.t, -s.t - hi) - slack;
    return std::isnan(gap) ? 0.0 : std::fmax(0.0, gap);
  }
  if (x.kind == Placed::Capsule)
  {
    double d2;
    double others = 0.0;
    if (y.kind == Placed::Capsule)
    {
      d2 = AxisAxisSquare(x.c, x.a, x.L, y.c, y.a, y.L);
      others = y.r;
    }
    else if (y.kind == Placed::Sphere)
    {
      const RKMMathVector w = y.c - x.c;
      const double s = x.a * w;
      const double sc = x.L > 0.0 ? std::fmax(-x.L, std::fmin(x.L, s)) : s;
      d2 = (w - x.a * sc).SquareNorm();
      others = y.r;
    }
    else
    {
      const RKMMathOBBBase &b = y.box;
      const RKMMathPoint c = b.XYZtoUVW(x.c);
      const RKMMathVector a(x.a * b.U(), x.a * b.V(), x.a * b.W());
      double where;
      d2 = RKMPolyLineBoxDistance::LineSquare(c, a, x.L, b.Diagonal(), where);
    }
    const double scale = Norm1(x.c.AsVector()) + (x.L > 0.0 ? x.L : 0.0) + x.r + others;
    return std::fmax(0.0, std::sqrt(d2) - x.r - others - kSlack * scale);
  }
  if (x.kind == Placed::Sphere)
  {
    if (y.kind == Placed::Sphere)
      return std::fmax(0.0, x.c.DistanceTo(y.c) - (x.r + y.r));
    const double d2 = y.rawBox ? y.fbox.GetMathBox().SquareDistanceTo(x.c) : y.box.SquareDistanceTo(x.c);
    return std::fmax(0.0, std::sqrt(d2) - x.r);
  }
  if (x.aligned && y.aligned)
  {
    // Both unplaced: the exact distance between the axis-aligned boxes (the oriented test would only
    // give the largest gap along one axis).
    RKMMathBox bx, by;
    x.box.GetBox(bx);
    y.box.GetBox(by);
    return std::sqrt(bx.SquareDistanceTo(by));
  }
  return std::sqrt(x.box.SquareDistanceTo(y.box));
}

// An upper bound of the largest distance between points of two placed volumes (neither a slab).
double PointMaxDistance(const RKMMathPoint &p, const Placed &v)
{
  switch (v.kind)
  {
  case Placed::Sphere:
    return p.DistanceTo(v.c) + v.r;
  case Placed::Box:
    return std::sqrt(v.box.MaxSquareDistanceTo(p));
  case Placed::Capsule:
    if (!(v.L > 0.0))
      return 1e30;
    return std::fmax(p.DistanceTo(v.c + v.a * v.L), p.DistanceTo(v.c - v.a * v.L)) + v.r;
  case Placed::Slab:
    return 1e30;
  }
  return 1e30;
}

double MaxDistance(const Placed &x, const Placed &y)
{
  double m;
  if (x.kind == Placed::Capsule)
  {
    if (!(x.L > 0.0))
      return 1e30;
    // The farthest point from a convex set over a segment is reached at an end.
    m = std::fmax(PointMaxDistance(x.c + x.a * x.L, y), PointMaxDistance(x.c - x.a * x.L, y)) + x.r;
  }
  else if (x.kind == Placed::Sphere)
    m = PointMaxDistance(x.c, y) + x.r;
  else
    m = std::sqrt(x.box.MaxSquareDistanceTo(y.box));
  return m >= 1e30 ? 1e30 : m * (1.0 + kSlack);
}

// Normalises a pair into owner (lower rank) first; the tolerance goes to the owner.
void Order(const BV *&b1, const BV *&b2, const RKMMathTransformation *&T1, const RKMMathTransformation *&T2)
{
  if (Rank(b2->GetTypeID()) < Rank(b1->GetTypeID()))
  {
    std::swap(b1, b2);
    std::swap(T1, T2);
  }
}

bool Known(const BV *bv) { return bv && Rank(bv->GetTypeID()) >= 0; }

bool Overlap(const BV *b1, const BV *b2, double tolerance, const RKMMathTransformation *T1,
             const RKMMathTransformation *T2)
{
  // Unknown kinds cannot be ruled out.
  if (!Known(b1) || !Known(b2))
    return true;
  const BV::TypeID k1 = b1->GetTypeID(), k2 = b2->GetTypeID();
  // The unplaced pairs of a hierarchy walk, answered without building placed volumes.
  if (!T1 && !T2 && k1 == k2)
  {
    if (k1 == BV::TypeAABB)
    {
      const RKMPolyBoxf &f1 = static_cast<const RKMPolyAABB *>(b1)->GetBoxf();
      const RKMPolyBoxf &f2 = static_cast<const RKMPolyAABB *>(b2)->GetBoxf();
      // The tolerance as a float no smaller than it, so that rounding cannot separate touching boxes.
      float ft = RKMRoundToFloat(tolerance);
      if (ft < tolerance)
        ft = std::nextafter(ft, HUGE_VALF);
      return !f1.IsEmpty() && !f2.IsEmpty() && f1.FastIsIntersecting(f2, ft);
    }
    if (k1 == BV::TypeSphere)
    {
      const RKMPolyBoundingSphere *s1 = static_cast<const RKMPolyBoundingSphere *>(b1);
      const RKMPolyBoundingSphere *s2 = static_cast<const RKMPolyBoundingSphere *>(b2);
      const double R = s1->GetRadius() + tolerance + s2->GetRadius();
      return s1->GetRadius() >= 0.0 && s2->GetRadius() >= 0.0 && R >= 0.0 &&
             R * R >= s1->GetCenter().SquareDistanceTo(s2->GetCenter());
    }
    if (k1 == BV::TypeOBB && tolerance == 0.0)
      return static_cast<const RKMPolyOBB *>(b1)->GetBase().IsIntersecting(
          static_cast<const RKMPolyOBB *>(b2)->GetBase());
  }
  Order(b1, b2, T1, T2);
  if (k1 >= BV::TypeAABB && k1 <= BV::TypeOBB && k2 >= BV::TypeAABB && k2 <= BV::TypeOBB && k1 != BV::TypeSphere &&
      k2 != BV::TypeSphere && (T1 || T2))
  {
    // Two boxes, placed: both as oriented boxes in the common frame, the owner inflated.
    const RKMMathOBBBase o1 = PlacedBox(*b1, T1, tolerance), o2 = PlacedBox(*b2, T2, 0.0);
    return o1.IsIntersecting(o2);
  }
  const Placed x = Place(*b1, T1, tolerance), y = Place(*b2, T2, 0.0);
  // An infinitely thick slab is all of space: it meets every volume, an empty one included.
  if ((x.kind == Placed::Slab && x.allSpace) || (y.kind == Placed::Slab && y.allSpace))
    return true;
  if (x.empty || y.empty)
    return false;
  if (x.kind == Placed::Sphere && y.kind == Placed::Sphere)
  {
    const double R = x.r + y.r;
    return R * R >= x.c.SquareDistanceTo(y.c);
  }
  if (x.kind == Placed::Box && y.kind == Placed::Box && x.rawBox && y.rawBox)
    return x.fbox.IsIntersecting(y.fbox, 0.0f);
  if (x.kind == Placed::Box && y.kind == Placed::Box)
    return x.box.IsIntersecting(y.box);
  return MinDistance(x, y) == 0.0;
}
}

unsigned char RKMPolyBVBVOperations::BVOverLap(const BV *bv1, const BV *bv2, double tolerance,
                                              const RKMMathTransformation *T1, const RKMMathTransformation *T2)
{
  if (!bv1 || !bv2)
    return 0;
  return Overlap(bv1, bv2, tolerance, T1, T2);
}

unsigned char RKMPolyBVBVOperations::BVOverLapOnePos(const BV *bv1, const BV *bv2, double tolerance,
                                                    const RKMMathTransformation *T)
{
  if (!bv1 || !bv2 || RKMPolyBVProperties::IsEmpty(bv1) || RKMPolyBVProperties::IsEmpty(bv2))
    return 0;
  return Overlap(bv1, bv2, tolerance, nullptr, T);
}

unsigned char RKMPolyBVBVOperations::BVOverLapOnePos(const BV *bv1, const BV *bv2, const RKMMathVector &v,
                                                    double tolerance)
{
  if (!bv1 || !bv2)
    return 0;
  const RKMMathTransformation T(v);
  return Overlap(bv1, bv2, tolerance, nullptr, &T);
}

unsigned char RKMPolyBVBVOperations::BVOverlapNoPos(const BV *bv1, const BV *bv2, double tolerance)
{
  if (!bv1 || !bv2)
    return 0;
  return Overlap(bv1, bv2, tolerance, nullptr, nullptr);
}

double RKMPolyBVBVOperations::GetMinimumDistance(const BV *bv1, const BV *bv2, double tolerance,
                                                 const RKMMathTransformation *T1, const RKMMathTransformation *T2)
{
  if (!Known(bv1) || !Known(bv2) || RKMPolyBVProperties::IsEmpty(bv1) || RKMPolyBVProperties::IsEmpty(bv2))
    return -1.0;
  Order(bv1, bv2, T1, T2);
  const Placed x = Place(*bv1, T1, tolerance), y = Place(*bv2, T2, 0.0);
  if (x.empty && !(x.kind == Placed::Slab && x.allSpace))
    return -1.0;
  return MinDistance(x, y);
}

double RKMPolyBVBVOperations::GetSquareMinimumDistance(const BV *bv1, const BV *bv2, double tolerance,
                                                       const RKMMathTransformation *T1,
                                                       const RKMMathTransformation *T2)
{
  const double d = GetMinimumDistance(bv1, bv2, tolerance, T1, T2);
  return d < 0.0 ? -1.0 : d * d;
}

double RKMPolyBVBVOperations::GetMaximumDistance(const BV *bv1, const BV *bv2, double tolerance,
                                                 const RKMMathTransformation *T1, const RKMMathTransformation *T2)
{
  if (!Known(bv1) || !Known(bv2) || RKMPolyBVProperties::IsEmpty(bv1) || RKMPolyBVProperties::IsEmpty(bv2))
    return -1.0;
  const BV::TypeID k1 = bv1->GetTypeID(), k2 = bv2->GetTypeID();
  if (k1 == BV::TypePlane || (k2 == BV::TypePlane && k1 != BV::TypeCylinder))
    return 1e40;
  if (k2 == BV::TypePlane)
    return 1e30;
  Order(bv1, bv2, T1, T2);
  const Placed x = Place(*bv1, T1, tolerance), y = Place(*bv2, T2, 0.0);
  if (x.empty)
    return -1.0;
  return MaxDistance(x, y);
}

double RKMPolyBVBVOperations::GetSquareMaximumDistance(const BV *bv1, const BV *bv2, double tolerance,
                                                       const RKMMathTransformation *T1,
                                                       const RKMMathTransformation *T2)
{
  const double d = GetMaximumDistance(bv1, bv2, tolerance, T1, T2);
  if (d < 0.0)
    return -1.0;
  return d >= 1e40 ? 1e40 : d * d;
}

unsigned char RKMPolyBVBVOperations::GetSquareMinDirDistance(const BV *bv1, const BV *bv2,
                                                            const RKMMathVector &direction, double &squareDistance,
                                                            double tolerance, const RKMMathTransformation *T1,
                                                            const RKMMathTransformation *T2, double)
{
  if (!Known(bv1) || !Known(bv2) || RKMPolyBVProperties::IsEmpty(bv1) || RKMPolyBVProperties::IsEmpty(bv2))
    return 0;
  Order(bv1, bv2, T1, T2);
  const Placed x = Place(*bv1, T1, tolerance), y = Place(*bv2, T2, 0.0);
  if (x.empty || y.empty)
    return 0;
  if (MinDistance(x, y) == 0.0)
  {
    squareDistance = 0.0;
    return 1;
  }
  RKMMathVector d = direction;
  if (FAILED(d.Normalize()))
    return 0;
  if (x.kind == Placed::Sphere && y.kind == Placed::Sphere)
  {
    const RKMMathVector w = y.c - x.c;
    const double R = x.r + y.r;
    const double k = (d ^ w).SquareNorm() / (R * R);
    if (!(k <= 1.0))
      return 0;
    // The travels that bring the spheres into contact form [d·w − h, d·w + h]; the one of least size is
    // the end nearer to 0, on whichever side of bv1 the other lies.
    const double dw = d * w, h = R * std::sqrt(1.0 - k);
    const double tau = dw >= 0.0 ? dw - h : dw + h;
    squareDistance = tau * tau;
    return 1;
  }
  // Every other pair: each volume is replaced by an oriented box or a sphere that encloses it. Enclosing
  // volumes meet after no more travel than the true ones, so the travel is never overstated. Slabs and
  // infinite cylinders are met from almost every direction: they answer true with 0.
  auto toBox = [](const Placed &v, RKMMathOBBBase &box) {
    if (v.kind == Placed::Box)
    {
      box = v.box;
      return true;
    }
    if (v.kind == Placed::Capsule && v.L > 0.0)
    {
      RKMMathVector axes[3] = {v.a, RKMMathVector(), RKMMathVector()};
      const RKMMathVector pick = std::fabs(v.a.x) < 0.6 ? RKMMathVector(1, 0, 0) : RKMMathVector(0, 1, 0);
      axes[1] = v.a ^ pick;
      axes[1].Normalize();
      axes[2] = v.a ^ axes[1];
      axes[2].Normalize();
      const double grow = 1.0 + kSlack;
      box = RKMMathOBBBase(axes, RKMMathVector((v.L + v.r) * grow, v.r * grow, v.r * grow), v.c);
      return true;
    }
    return false;
  };
  RKMMathOBBBase bx, by;
  const bool hx = toBox(x, bx), hy = toBox(y, by);
  // The box workers write their output even on a miss; this answer leaves it untouched then.
  double travel = 0.0;
  unsigned char hit = 1;
  if (hx && hy)
    hit = RKMPolyOBB(by).SquareDistanceMinDir(RKMPolyOBB(bx), d, travel);
  else if (x.kind == Placed::Sphere && hy)
    hit = RKMPolyOBB(by).SquareDistanceMinDir(x.c, x.r, -d, travel);
  else if (y.kind == Placed::Sphere && hx)
    hit = RKMPolyOBB(bx).SquareDistanceMinDir(y.c, y.r, d, travel);
  if (hit)
    squareDistance = travel;
  return hit;
}
