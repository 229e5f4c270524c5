#include "RKMPolyAABB.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

#include "RKMMathBox.h"
#include "RKMMathConstants.h"
#include "RKMMathTransformation.h"
#include "RKMTolerance.h"

#include <cmath>

namespace
{
// The component below which a ray direction counts as parallel to a box's slabs. A dimensionless
// threshold, so the default tolerance's numerical epsilon; read on first use, which makes it
// independent of the order in which the library's statics are built.
double RayEpsilon()
{
  static const double epsilon = RKMGetDefaultTolerance().GetNumericalEpsilon();
  return epsilon;
}

double LargestExtent(const RKMMathBox &box)
{
  double l[6];
  if (FAILED(box.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5])))
    return 0.0;
  return std::fmax(l[1] - l[0], std::fmax(l[3] - l[2], l[5] - l[4]));
}

unsigned char RayHitsBoxf(const RKMPolyBoxf &box, const RKMMathPoint &o, const RKMMathVector &d)
{
  double lo[3], hi[3];
  if (FAILED(box.GetLimits(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2])))
    return 0;
  const double eps = RayEpsilon();
  double tmin = -RKMdoubleMax, tmax = RKMdoubleMax;
  for (int i = 0; i < 3; ++i)
  {
    double nearT, farT;
    if (d[i] > eps)
    {
      if (o[i] > hi[i])
        return 0;
      nearT = (lo[i] - o[i]) / d[i];
      farT = (hi[i] - o[i]) / d[i];
    }
    else if (d[i] < -eps)
    {
      if (o[i] < lo[i])
        return 0;
      nearT = (hi[i] - o[i]) / d[i];
      farT = (lo[i] - o[i]) / d[i];
    }
    else
    {
      if (!(lo[i] <= o[i] && o[i] <= hi[i]))
        return 0;
      continue;
    }
    tmin = std::fmax(tmin, nearT);
    tmax = std::fmin(tmax, farT);
  }
  return tmax >= tmin;
}

// Squared distance from the ray o + t·d (t ≥ 0, d unit) to the axis of a cylinder: the segment of
// half-length L when L > 0, else the whole line (a limit of 0 reads as infinite, as in the point
// test). The distance is convex in (t, u), so its minimum over the strip or rectangle of parameters is
// the interior critical point when it lies inside, or else lies on an edge, where it is a clamped 1D
// minimum: the least of those candidates is exact. Each candidate's distance is measured between the
// two points themselves, which keeps nearly parallel rays accurate.
double RayAxisSquareDistance(const RKMPolyBoundingCylinder &c, const RKMMathPoint &o, const RKMMathVector &d)
{
  const RKMMathVector &a = c.GetDirection();
  const RKMMathVector w = o - c.GetCenter();
  const double L = c.GetLimit();
  const bool infinite = !(L > 0.0);
  const double k = d * a, s = a * w, q = d * w, D = 1.0 - k * k;
  auto at = [&](double t, double u) { return (w + d * t - a * u).SquareNorm(); };
  auto clampU = [&](double u) { return infinite ? u : std::fmax(-L, std::fmin(L, u)); };
  double best = at(0.0, clampU(s));
  if (D > 0.0)
  {
    const double t = (s * k - q) / D, u = s + t * k;
    if (std::isfinite(t) && t > 0.0 && (infinite || std::fabs(u) <= L))
      best = std::fmin(best, at(t, u));
  }
  if (!infinite)
  {
    best = std::fmin(best, at(std::fmax(0.0, k * L - q), L));
    best = std::fmin(best, at(std::fmax(0.0, -k * L - q), -L));
  }
  return best;
}
}

RKMPolyBVProperties::~RKMPolyBVProperties() = default;

RKMMathPoint RKMPolyBVProperties::GetCenter(const RKMPolyBoundingVolume *bv)
{
  if (!bv)
    return RKMMathPoint(0, 0, 0);
  switch (bv->GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
  {
    const RKMPolyBoxf &b = static_cast<const RKMPolyAABB *>(bv)->GetBoxf();
    if (b.IsEmpty())
      return RKMMathPoint(0, 0, 0);
    return RKMMathPoint((static_cast<double>(b.GetXMin()) + b.GetXMax()) * 0.5,
                        (static_cast<double>(b.GetYMin()) + b.GetYMax()) * 0.5,
                        (static_cast<double>(b.GetZMin()) + b.GetZMax()) * 0.5);
  }
  case RKMPolyBoundingVolume::TypeSphere:
    return static_cast<const RKMPolyBoundingSphere *>(bv)->GetCenter();
  case RKMPolyBoundingVolume::TypeOBB:
    return static_cast<const RKMPolyOBB *>(bv)->Center();
  case RKMPolyBoundingVolume::TypePlane:
    return static_cast<const RKMPolyBoundingPlane *>(bv)->GetOrigin();
  case RKMPolyBoundingVolume::TypeCylinder:
    return static_cast<const RKMPolyBoundingCylinder *>(bv)->GetCenter();
  }
  return RKMMathPoint(0, 0, 0);
}

double RKMPolyBVProperties::GetRadius(const RKMPolyBoundingVolume *bv)
{
  if (IsEmpty(bv))
    return 0.0;
  switch (bv->GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return 0.87 * LargestExtent(static_cast<const RKMPolyAABB *>(bv)->GetBoxf().GetMathBox());
  case RKMPolyBoundingVolume::TypeSphere:
    return static_cast<const RKMPolyBoundingSphere *>(bv)->GetRadius();
  case RKMPolyBoundingVolume::TypeOBB:
    return 0.87 * LargestExtent(static_cast<const RKMPolyOBB *>(bv)->GetAABB());
  case RKMPolyBoundingVolume::TypePlane:
    return 1e40;
  case RKMPolyBoundingVolume::TypeCylinder:
  {
    const RKMPolyBoundingCylinder *c = static_cast<const RKMPolyBoundingCylinder *>(bv);
    // A limit of 0 reads as infinite, as in the point and ray tests.
    return c->GetLimit() > 0.0 ? c->GetRadius() + c->GetLimit() : RKMMathInfinite;
  }
  }
  return 0.0;
}

double RKMPolyBVProperties::GetVolume(const RKMPolyBoundingVolume *bv)
{
  if (IsEmpty(bv))
    return 0.0;
  switch (bv->GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return static_cast<const RKMPolyAABB *>(bv)->GetBoxf().Volume();
  case RKMPolyBoundingVolume::TypeSphere:
  {
    const double r = static_cast<const RKMPolyBoundingSphere *>(bv)->GetRadius();
    return RKMPI * 1.3333 * r * r * r;
  }
  case RKMPolyBoundingVolume::TypeOBB:
  {
    const RKMMathVector h = static_cast<const RKMPolyOBB *>(bv)->Diagonal();
    return 8.0 * h.x * h.y * h.z;
  }
  case RKMPolyBoundingVolume::TypePlane:
    return static_cast<const RKMPolyBoundingPlane *>(bv)->GetThickness() * 1e60;
  case RKMPolyBoundingVolume::TypeCylinder:
  {
    const RKMPolyBoundingCylinder *c = static_cast<const RKMPolyBoundingCylinder *>(bv);
    if (!(c->GetLimit() > 0.0))
      return 1e30;
    return c->GetRadius() * c->GetRadius() * RKMPI * c->GetLimit();
  }
  }
  return 0.0;
}

unsigned char RKMPolyBVProperties::IsEmpty(const RKMPolyBoundingVolume *bv)
{
  if (!bv)
    return 1;
  switch (bv->GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return static_cast<const RKMPolyAABB *>(bv)->GetBoxf().IsEmpty();
  case RKMPolyBoundingVolume::TypeSphere:
    return !(static_cast<const RKMPolyBoundingSphere *>(bv)->GetRadius() > 0.0);
  case RKMPolyBoundingVolume::TypeOBB:
    return !static_cast<const RKMPolyOBB *>(bv)->IsDefined();
  case RKMPolyBoundingVolume::TypePlane:
    return !(static_cast<const RKMPolyBoundingPlane *>(bv)->GetThickness() > 0.0);
  case RKMPolyBoundingVolume::TypeCylinder:
    return !(static_cast<const RKMPolyBoundingCylinder *>(bv)->GetRadius() > 0.0);
  }
  return 1;
}

unsigned char RKMPolyBVProperties::IsPointInsideBV(const RKMPolyBoundingVolume &bv, const RKMMathPoint &p)
{
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return static_cast<const RKMPolyAABB &>(bv).GetBoxf().IsContaining(p);
  case RKMPolyBoundingVolume::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(bv);
    const double r = s.GetRadius();
    // A negative radius squared would look like a positive one: such a sphere holds nothing.
    return r >= 0.0 && r * r >= s.GetCenter().SquareDistanceTo(p);
  }
  case RKMPolyBoundingVolume::TypeOBB:
    return static_cast<const RKMPolyOBB &>(bv).IsContaining(p);
  case RKMPolyBoundingVolume::TypePlane:
  {
    const RKMPolyBoundingPlane &s = static_cast<const RKMPolyBoundingPlane &>(bv);
    return s.IsInfinitelyThick() || std::fabs(s.GetNormal() * (p - s.GetOrigin())) <= s.GetThickness();
  }
  case RKMPolyBoundingVolume::TypeCylinder:
  {
    const RKMPolyBoundingCylinder &c = static_cast<const RKMPolyBoundingCylinder &>(bv);
    const double r = c.GetRadius();
    if (!(r >= 0.0))
      return 0;
    const RKMMathVector w = p - c.GetCenter();
    const double s = c.GetDirection() * w, L = c.GetLimit();
    if (L <= 0.0)
      return r * r >= w * w - s * s;
    const double sc = std::fmax(-L, std::fmin(L, s));
    return r * r >= sc * sc + w * w - 2.0 * sc * s;
  }
  }
  return 0;
}

unsigned char RKMPolyBVProperties::IsRayIntersectingBV(const RKMPolyBoundingVolume &bv, const RKMMathPoint &origin,
                                                       const RKMMathDirection &direction)
{
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return RayHitsBoxf(static_cast<const RKMPolyAABB &>(bv).GetBoxf(), origin, direction);
  case RKMPolyBoundingVolume::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(bv);
    const double r = s.GetRadius();
    if (!(r >= 0.0))
      return 0;
    const RKMMathVector w = origin - s.GetCenter();
    const double b = direction * w, c = w * w - r * r;
    return b * b - c >= 0.0 && (b < 0.0 || c <= 0.0);
  }
  case RKMPolyBoundingVolume::TypeOBB:
  {
    RKMMathBox box;
    RKMMathTransformation T;
    if (FAILED(static_cast<const RKMPolyOBB &>(bv).ConvertToBoxAndTransformation(box, T)))
      return 0;
    T.ComputeInverse();
    RKMMathVector d = T * static_cast<const RKMMathVector &>(direction);
    RKMPolyBoundingCylinder::NormalizeDirection(d);
    RKMPolyBoxf local;
    local.SetBox(box);
    return RayHitsBoxf(local, T * origin, d);
  }
  case RKMPolyBoundingVolume::TypePlane:
  {
    const RKMPolyBoundingPlane &p = static_cast<const RKMPolyBoundingPlane &>(bv);
    const double s = p.GetNormal() * (origin - p.GetOrigin()), k = p.GetNormal() * direction;
    const double t = p.GetThickness();
    if (s > t)
      return k < 0.0;
    if (s < -t)
      return k > 0.0;
    return 1;
  }
  case RKMPolyBoundingVolume::TypeCylinder:
  {
    const RKMPolyBoundingCylinder &c = static_cast<const RKMPolyBoundingCylinder &>(bv);
    const double r = c.GetRadius();
    if (!(r >= 0.0))
      return 0;
    // A few ulps of room: the distance is computed, the contact may be a tangency.
    return r * r * (1.0 + 1e-14) >= RayAxisSquareDistance(c, origin, direction);
  }
  }
  return 0;
}
