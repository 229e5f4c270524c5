// The absorbing half of RKMPolyBVBVOperations (Absorb, GetVolumeOfUnion), apart from its overlap and
// distance tests in RKMPolyBVBVOperations.cpp.
#include "RKMPolyAABB.h"
#include "RKMPolyBVBVOperations.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

#include "RKMMathBox.h"
#include "RKMMathConstants.h"
#include "RKMMathTransformation.h"
#include "RKMTolerance.h"

#include <cfloat>
#include <cmath>

namespace
{
typedef RKMPolyBoundingVolume BV;
constexpr double kSlack = 64 * DBL_EPSILON;

double Norm1(const RKMMathPoint &p) { return std::fabs(p.x) + std::fabs(p.y) + std::fabs(p.z); }

// A capsule's axis is read as infinite when its half-length is not positive, as in every test.
bool InfiniteCapsule(const RKMPolyBoundingCylinder &c) { return !(c.GetLimit() > 0.0); }

struct Ball
{
  RKMMathPoint c;
  double r;
};

// The ball that bounds a volume (box: centre and half its diagonal; capsule: centre, radius + limit).
// False for a slab, an infinite capsule, an empty box or an unknown kind.
bool BoundingBall(const BV &bv, Ball &ball)
{
  switch (bv.GetTypeID())
  {
  case BV::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(bv);
    ball = {s.GetCenter(), s.GetRadius()};
    return true;
  }
  case BV::TypeAABB:
  {
    const RKMMathBox box = static_cast<const RKMPolyAABB &>(bv).GetBoxf().GetMathBox();
    if (box.IsEmpty())
      return false;
    const RKMMathPoint lo = box.GetLow(), hi = box.GetHigh();
    ball = {RKMMathPoint((lo.x + hi.x) * 0.5, (lo.y + hi.y) * 0.5, (lo.z + hi.z) * 0.5),
            0.5 * lo.DistanceTo(hi) * (1.0 + kSlack)};
    return true;
  }
  case BV::TypeOBB:
  {
    const RKMPolyOBB &o = static_cast<const RKMPolyOBB &>(bv);
    if (!o.IsDefined())
      return false;
    ball = {o.Center(), o.Diagonal().Norm() * (1.0 + kSlack)};
    return true;
  }
  case BV::TypeCylinder:
  {
    const RKMPolyBoundingCylinder &c = static_cast<const RKMPolyBoundingCylinder &>(bv);
    if (InfiniteCapsule(c) || !(c.GetRadius() >= 0.0))
      return false;
    ball = {c.GetCenter(), c.GetRadius() + c.GetLimit()};
    return true;
  }
  case BV::TypePlane:
    return false;
  }
  return false;
}

// Sphere merge: S_FALSE when the other lies inside, else the target becomes the other or the smallest
// ball around both, grown by a few ulps so that rounding cannot leave either outside.
HRESULT MergeBall(RKMPolyBoundingSphere &target, const Ball &other)
{
  if (!(other.r >= 0.0))
    return S_FALSE;
  const RKMMathPoint c1 = target.GetCenter();
  const double r1 = target.GetRadius(), r2 = other.r;
  const double d2 = c1.SquareDistanceTo(other.c);
  const double diff = r1 - r2;
  if (r1 >= r2 && diff * diff >= d2)
    return S_FALSE;
  if (r2 >= r1 && diff * diff >= d2)
  {
    target.Set(other.c, r2);
    return S_OK;
  }
  RKMMathVector u = other.c - c1;
  u.Normalize();
  const double R = (std::sqrt(d2) + r1 + r2) * 0.5;
  const RKMMathPoint c = c1 + u * (R - r1);
  target.Set(c, R * (1.0 + kSlack) + kSlack * Norm1(c));
  return S_OK;
}

// The extent along the unit normal n, from o, of a volume: [lo, hi]; false when it is unbounded along
// n (a slab that is not parallel or is all of space, an infinite capsule whose axis crosses n).
// empty is set for an empty box.
bool Extent(const BV &bv, const RKMMathVector &n, const RKMMathPoint &o, double &lo, double &hi, bool &empty)
{
  empty = false;
  switch (bv.GetTypeID())
  {
  case BV::TypeAABB:
  case BV::TypeOBB:
  {
    RKMMathOBBBase box;
    if (bv.GetTypeID() == BV::TypeAABB)
      box = RKMMathOBBBase(static_cast<const RKMPolyAABB &>(bv).GetBoxf().GetMathBox());
    else
      box = static_cast<const RKMPolyOBB &>(bv).GetBase();
    if (!box.IsDefined())
    {
      empty = true;
      return true;
    }
    const double s = n * (box.Center() - o);
    double e = 0.0;
    for (int i = 0; i < 3; ++i)
      e += box.Diagonal()[i] * std::fabs(n * box.Axis(i));
    lo = s - e;
    hi = s + e;
    return true;
  }
  case BV::TypeSphere:
  {
    const RKMPolyBoundingSphere &sp = static_cast<const RKMPolyBoundingSphere &>(bv);
    if (!(sp.GetRadius() >= 0.0))
    {
      empty = true;
      return true;
    }
    const double s = n * (sp.GetCenter() - o);
    lo = s - sp.GetRadius();
    hi = s + sp.GetRadius();
    return true;
  }
  case BV::TypePlane:
  {
    const RKMPolyBoundingPlane &p = static_cast<const RKMPolyBoundingPlane &>(bv);
    // Two slabs that are not exactly parallel cross somewhere, however small the angle: only a thickness
    // of all space holds both.
    if (p.IsInfinitelyThick() || (n ^ p.GetNormal()).SquareNorm() > 0.0)
      return false;
    const double s = n * (p.GetOrigin() - o);
    lo = s - p.GetThickness();
    hi = s + p.GetThickness();
    return true;
  }
  case BV::TypeCylinder:
  {
    const RKMPolyBoundingCylinder &c = static_cast<const RKMPolyBoundingCylinder &>(bv);
    if (!(c.GetRadius() >= 0.0))
    {
      empty = true;
      return true;
    }
    RKMMathVector axis = c.GetDirection();
    RKMPolyBoundingCylinder::NormalizeDirection(axis);
    const double k = std::fabs(n * axis);
    if (InfiniteCapsule(c) && k > 0.0)
      return false;
    const double s = n * (c.GetCenter() - o);
    const double e = (InfiniteCapsule(c) ? 0.0 : k * c.GetLimit()) + c.GetRadius();
    lo = s - e;
    hi = s + e;
    return true;
  }
  }
  return false;
}

HRESULT GrowSlab(RKMPolyBoundingPlane &target, const BV &other)
{
  if (target.IsInfinitelyThick())
    return S_FALSE;
  const RKMMathVector n = target.GetNormal();
  const RKMMathPoint o = target.GetOrigin();
  const double t = target.GetThickness();
  double a = 0.0, b = 0.0;
  bool empty = false;
  if (!Extent(other, n, o, a, b, empty))
  {
    target.SetInfinitelyThick(1);
    return S_OK;
  }
  if (empty || (a >= -t && b <= t))
    return S_FALSE;
  const double lo = std::fmin(a, -t), hi = std::fmax(b, t);
  const RKMMathPoint origin = o + n * ((hi + lo) * 0.5);
  target.SetOrigin(origin);
  target.SetThickness((hi - lo) * 0.5 * (1.0 + kSlack) + kSlack * (Norm1(origin) + Norm1(o)));
  return S_OK;
}

// The capsule grows to hold the ball (q, rs) (rs = 0 for a point). Radially toward q, then along the
// axis over q's projection; an infinite capsule only grows radially.
HRESULT CapsuleAbsorbBall(RKMPolyBoundingCylinder &cap, const RKMMathPoint &q, double rs)
{
  static const double epsilon = RKMGetDefaultTolerance().GetNumericalEpsilon();
  const RKMMathVector a = cap.GetDirection();
  RKMMathPoint c = cap.GetCenter();
  double r = cap.GetRadius(), L = cap.GetLimit();
  const bool infinite = InfiniteCapsule(cap);
  const RKMMathVector w = q - c;
  const RKMMathVector nrm = a ^ w;
  const double rho = nrm.Norm();
  if (rho > epsilon * (infinite ? 0.0 : L))
  {
    const RKMMathVector u = (nrm / rho) ^ a;
    const double reach = rho + rs;
    if (rs - rho >= r)
    {
      // In the cross-section the ball's circle holds the capsule's: the axis moves onto the ball's
      // centre and takes its radius (the halfway rule would leave part of the ball outside).
      c += u * rho;
      r = rs;
    }
    else if (reach > r)
    {
      c += u * ((reach - r) * 0.5);
      r = (r + reach) * 0.5;
    }
  }
  else if (rs > r)
    r = rs;
  if (!infinite)
  {
    const double t = a * (q - c);
    const double hi = std::fmax(t, L), lo = std::fmin(t, -L);
    if (hi != L || lo != -L)
    {
      c += a * ((hi + lo) * 0.5);
      L = (hi - lo) * 0.5;
    }
  }
  if (c == cap.GetCenter() && r == cap.GetRadius() && L == cap.GetLimit())
    return S_FALSE;
  // A few ulps of growth: the new boundary passes through q's reach exactly, and rounding could put it
  // just inside.
  const double grow = kSlack * (Norm1(c) + r + (infinite ? 0.0 : L));
  cap.Set(c, a, r + grow, infinite ? L : L + grow);
  return S_OK;
}

HRESULT CapsuleAbsorbCorners(RKMPolyBoundingCylinder &cap, const RKMMathOBBBase &box)
{
  if (!box.IsDefined())
    return E_FAIL;
  RKMMathPoint corners[8];
  box.GetCorners(corners);
  HRESULT result = S_FALSE;
  for (const RKMMathPoint &p : corners)
    if (CapsuleAbsorbBall(cap, p, 0.0) == S_OK)
      result = S_OK;
  return result;
}

HRESULT AbsorbIntoBox(RKMPolyAABB &target, const BV &other)
{
  RKMPolyBoxf box(target.GetBoxf());
  const RKMPolyBoxf before = box;
  HRESULT hr = S_OK;
  switch (other.GetTypeID())
  {
  case BV::TypeAABB:
  {
    const RKMPolyBoxf &o = static_cast<const RKMPolyAABB &>(other).GetBoxf();
    if (!o.IsEmpty())
      box.AddInside(o);
    break;
  }
  case BV::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(other);
    const RKMMathPoint &c = s.GetCenter();
    const double r = s.GetRadius();
    if (r >= 0.0)
      box.AddInside(RKMMathBox(c.x - r, c.x + r, c.y - r, c.y + r, c.z - r, c.z + r));
    break;
  }
  case BV::TypeOBB:
    box.AddInside(static_cast<const RKMPolyOBB &>(other).GetAABB());
    break;
  case BV::TypePlane:
    return E_FAIL;
  case BV::TypeCylinder:
  {
    RKMMathBox enclosing;
    if (FAILED(RKMPolyBVOperations::GetEnclosingBox(other, enclosing)))
      return E_FAIL;
    box.AddInside(enclosing);
    break;
  }
  default:
    target.SetBoxf(box);
    return S_FALSE;
  }
  target.SetBoxf(box);
  hr = RKMPolyAABB(box) == RKMPolyAABB(before) ? S_FALSE : S_OK;
  return hr;
}

HRESULT AbsorbIntoOBB(RKMPolyOBB &target, const BV &other)
{
  switch (other.GetTypeID())
  {
  case BV::TypeAABB:
    return target.GetBase().Absorb(RKMMathOBBBase(static_cast<const RKMPolyAABB &>(other).GetBoxf().GetMathBox()));
  case BV::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(other);
    const RKMMathPoint &c = s.GetCenter();
    const double r = s.GetRadius();
    if (!(r >= 0.0))
      return S_FALSE;
    return target.GetBase().Absorb(RKMMathOBBBase(RKMMathBox(c.x - r, c.x + r, c.y - r, c.y + r, c.z - r, c.z + r)));
  }
  case BV::TypeOBB:
    return target.Absorb(static_cast<const RKMPolyOBB &>(other));
  case BV::TypePlane:
    return E_FAIL;
  case BV::TypeCylinder:
  {
    RKMMathBox enclosing;
    if (FAILED(RKMPolyBVOperations::GetEnclosingBox(other, enclosing)))
      return E_FAIL;
    return target.GetBase().Absorb(RKMMathOBBBase(enclosing));
  }
  }
  return S_FALSE;
}

HRESULT AbsorbIntoSphere(RKMPolyBoundingSphere &target, const BV &other)
{
  switch (other.GetTypeID())
  {
  case BV::TypePlane:
    return E_FAIL;
  case BV::TypeCylinder:
    if (!(static_cast<const RKMPolyBoundingCylinder &>(other).GetRadius() >= 0.0))
      return S_FALSE;
    if (InfiniteCapsule(static_cast<const RKMPolyBoundingCylinder &>(other)))
      return E_FAIL;
    break;
  case BV::TypeAABB:
    if (static_cast<const RKMPolyAABB &>(other).GetBoxf().IsEmpty())
      return S_FALSE;
    break;
  case BV::TypeSphere:
  case BV::TypeOBB:
    break;
  default:
    return S_FALSE;
  }
  Ball ball;
  if (!BoundingBall(other, ball))
    return S_FALSE;
  return MergeBall(target, ball);
}

HRESULT AbsorbIntoCapsule(RKMPolyBoundingCylinder &target, const BV &other)
{
  switch (other.GetTypeID())
  {
  case BV::TypeAABB:
  {
    const RKMPolyBoxf &f = static_cast<const RKMPolyAABB &>(other).GetBoxf();
    if (f.IsEmpty())
      return S_FALSE;
    return CapsuleAbsorbCorners(target, RKMMathOBBBase(f.GetMathBox()));
  }
  case BV::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(other);
    if (!(s.GetRadius() >= 0.0))
      return S_FALSE;
    return CapsuleAbsorbBall(target, s.GetCenter(), s.GetRadius());
  }
  case BV::TypeOBB:
  {
    const RKMPolyOBB &o = static_cast<const RKMPolyOBB &>(other);
    return o.IsDefined() ? CapsuleAbsorbCorners(target, o.GetBase()) : S_FALSE;
  }
  case BV::TypePlane:
    return E_FAIL;
  case BV::TypeCylinder:
  {
    const RKMPolyBoundingCylinder &o = static_cast<const RKMPolyBoundingCylinder &>(other);
    // No finite capsule holds an infinite one.
    if (InfiniteCapsule(o))
      return E_FAIL;
    if (!(o.GetRadius() >= 0.0))
      return S_FALSE;
    const RKMMathVector e = o.GetDirection() * o.GetLimit();
    const HRESULT first = CapsuleAbsorbBall(target, o.GetCenter() + e, o.GetRadius());
    const HRESULT second = CapsuleAbsorbBall(target, o.GetCenter() - e, o.GetRadius());
    return first == S_OK ? S_OK : (second == S_OK ? S_OK : S_FALSE);
  }
  }
  return S_FALSE;
}

double SphereVolume(double r) { return RKMPI * 1.3333 * r * r * r; }
}

HRESULT RKMPolyBVBVOperations::Absorb(BV *target, const BV *other)
{
  if (!target)
    return E_FAIL;
  if (!other)
    return S_FALSE;
  switch (target->GetTypeID())
  {
  case BV::TypeAABB:
    return AbsorbIntoBox(static_cast<RKMPolyAABB &>(*target), *other);
  case BV::TypeSphere:
    return AbsorbIntoSphere(static_cast<RKMPolyBoundingSphere &>(*target), *other);
  case BV::TypeOBB:
    return AbsorbIntoOBB(static_cast<RKMPolyOBB &>(*target), *other);
  case BV::TypePlane:
    return GrowSlab(static_cast<RKMPolyBoundingPlane &>(*target), *other);
  case BV::TypeCylinder:
    return AbsorbIntoCapsule(static_cast<RKMPolyBoundingCylinder &>(*target), *other);
  }
  return E_FAIL;
}

double RKMPolyBVBVOperations::GetVolumeOfUnion(const BV *bv1, const BV *bv2)
{
  if (!bv1 || !bv2)
    return 0.0;
  const BV::TypeID k2 = bv2->GetTypeID();
  switch (bv1->GetTypeID())
  {
  case BV::TypePlane:
    return 1e40;
  case BV::TypeCylinder:
  {
    // With a slab the union is unbounded in every case (1e40); with a volume that no capsule holds (an
    // infinite cylinder) it is infinite (1e30). The capsule measure π·r²·limit ignores the end caps, so
    // the result is also kept at least each volume's own measure.
    if (k2 == BV::TypePlane)
      return 1e40;
    const RKMPolyBoundingCylinder &c = static_cast<const RKMPolyBoundingCylinder &>(*bv1);
    if (InfiniteCapsule(c))
      return 1e30;
    RKMPolyBoundingCylinder copy(c);
    if (FAILED(AbsorbIntoCapsule(copy, *bv2)))
      return 1e30;
    return std::fmax(RKMPolyBVProperties::GetVolume(&copy),
                     std::fmax(RKMPolyBVProperties::GetVolume(bv1), RKMPolyBVProperties::GetVolume(bv2)));
  }
  case BV::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(*bv1);
    if (k2 == BV::TypePlane)
      return 1e40;
    Ball other;
    if (k2 == BV::TypeCylinder && !BoundingBall(*bv2, other))
      return RKMMathInfinite;
    if (!BoundingBall(*bv2, other))
      return SphereVolume(s.GetRadius());
    const double r1 = s.GetRadius(), r2 = other.r, d = s.GetCenter().DistanceTo(other.c);
    if ((r1 - r2) * (r1 - r2) >= d * d)
      return SphereVolume(std::fmax(r1, r2));
    return SphereVolume((d + r1 + r2) * 0.5);
  }
  case BV::TypeAABB:
  {
    const RKMPolyBoxf &f = static_cast<const RKMPolyAABB &>(*bv1).GetBoxf();
    RKMPolyBoxf u;
    switch (k2)
    {
    case BV::TypeSphere:
    case BV::TypeCylinder:
      return GetVolumeOfUnion(bv2, bv1);
    case BV::TypePlane:
      return 1e40;
    case BV::TypeAABB:
      u.SetToUnion(f, static_cast<const RKMPolyAABB &>(*bv2).GetBoxf());
      break;
    case BV::TypeOBB:
    {
      RKMPolyBoxf o;
      o.SetBox(static_cast<const RKMPolyOBB &>(*bv2).GetAABB());
      u.SetToUnion(f, o);
      break;
    }
    default:
      return 0.0;
    }
    return u.Volume();
  }
  case BV::TypeOBB:
  {
    switch (k2)
    {
    case BV::TypeSphere:
    case BV::TypeAABB:
    case BV::TypeCylinder:
      return GetVolumeOfUnion(bv2, bv1);
    case BV::TypePlane:
      return 1e40;
    case BV::TypeOBB:
    {
      RKMMathBox box = static_cast<const RKMPolyOBB &>(*bv1).GetAABB();
      box.AddInside(static_cast<const RKMPolyOBB &>(*bv2).GetAABB());
      return box.Volume();
    }
    default:
      return 0.0;
    }
  }
  }
  return 0.0;
}
