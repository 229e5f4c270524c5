#pragma once

// Random geometry shared by the bounding-volume tests: rotations, transformations of the four
// families the placement code distinguishes, random volumes, and points sampled strictly inside them.

#include "RKMMath3x3Matrix.h"
#include "RKMMathTransformation.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

#include "RKMMathBox.h"

#include <cmath>
#include <memory>
#include <random>

namespace bvtest
{
using Rng = std::mt19937_64;
using BVPtr = std::unique_ptr<RKMPolyBoundingVolume>;

// Keeps sampled points off the boundary by far more than the rounding of any placement.
constexpr double kShrink = 1.0 - 1e-9;

inline double Uniform(Rng &g, double a, double b) { return std::uniform_real_distribution<double>(a, b)(g); }

inline RKMMathVector RandomUnit(Rng &g)
{
  std::normal_distribution<double> n;
  RKMMathVector v;
  do
    v = RKMMathVector(n(g), n(g), n(g));
  while (v.Norm() < 1e-3);
  v.Normalize();
  return v;
}

inline RKMMathPoint RandomPoint(Rng &g, double r)
{
  return RKMMathPoint(Uniform(g, -r, r), Uniform(g, -r, r), Uniform(g, -r, r));
}

// Uniform over rotations (unit quaternion).
inline RKMMath3x3Matrix RandomRotation(Rng &g)
{
  std::normal_distribution<double> n;
  double w = n(g), x = n(g), y = n(g), z = n(g);
  const double l = std::sqrt(w * w + x * x + y * y + z * z);
  w /= l, x /= l, y /= l, z /= l;
  return RKMMath3x3Matrix(1 - 2 * (y * y + z * z), 2 * (x * y - w * z), 2 * (x * z + w * y),
                          2 * (x * y + w * z), 1 - 2 * (x * x + z * z), 2 * (y * z - w * x),
                          2 * (x * z - w * y), 2 * (y * z + w * x), 1 - 2 * (x * x + y * y));
}

enum class TKind { Rigid, UniformScale, NonUniformScale, Shear };
constexpr TKind kAllTKinds[] = {TKind::Rigid, TKind::UniformScale, TKind::NonUniformScale, TKind::Shear};

inline const char *Name(TKind k)
{
  switch (k)
  {
  case TKind::Rigid: return "rigid";
  case TKind::UniformScale: return "uniform scale";
  case TKind::NonUniformScale: return "non-uniform scale";
  case TKind::Shear: return "shear";
  }
  return "?";
}

inline RKMMathTransformation RandomTransformation(Rng &g, TKind k)
{
  const RKMMath3x3Matrix R = RandomRotation(g);
  RKMMath3x3Matrix M = R;
  switch (k)
  {
  case TKind::Rigid:
    break;
  case TKind::UniformScale:
  {
    // Reflections included: a negative scale must still scale lengths by |s|.
    const double s = Uniform(g, 0.2, 5.0) * (Uniform(g, 0, 1) < 0.3 ? -1.0 : 1.0);
    M = R * RKMMath3x3Matrix(s, 0, 0, 0, s, 0, 0, 0, s);
    break;
  }
  case TKind::NonUniformScale:
    M = R * RKMMath3x3Matrix(Uniform(g, 0.2, 4), 0, 0, 0, Uniform(g, 0.2, 4), 0, 0, 0, Uniform(g, 0.2, 4)) *
        RandomRotation(g);
    break;
  case TKind::Shear:
    M = R * RKMMath3x3Matrix(1, Uniform(g, -1.5, 1.5), Uniform(g, -1.5, 1.5), 0, 1, Uniform(g, -1.5, 1.5), 0, 0, 1);
    break;
  }
  return RKMMathTransformation(M, RandomPoint(g, 5).AsVector());
}

// Kinds of random volume: the five types plus the infinite cylinder, which behaves apart.
enum VKind { kAABB, kSphere, kOBB, kSlab, kCapsule, kInfiniteCylinder, kVKindCount };

inline const char *Name(int k)
{
  static const char *const names[] = {"AABB", "sphere", "OBB", "slab", "capsule", "infinite cylinder"};
  return names[k];
}

inline BVPtr RandomVolume(Rng &g, int kind)
{
  const RKMMathPoint c = RandomPoint(g, 3);
  switch (kind)
  {
  case kAABB:
    return BVPtr(new RKMPolyAABB(RKMMathBox(c, c + RKMMathVector(Uniform(g, 0.1, 3), Uniform(g, 0.1, 3), Uniform(g, 0.1, 3)))));
  case kSphere:
    return BVPtr(new RKMPolyBoundingSphere(c, Uniform(g, 0.1, 2.5)));
  case kOBB:
  {
    const RKMMath3x3Matrix R = RandomRotation(g);
    const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
    return BVPtr(new RKMPolyOBB(axes, RKMMathVector(Uniform(g, 0.05, 2), Uniform(g, 0.05, 2), Uniform(g, 0.05, 2)), c));
  }
  case kSlab:
    return BVPtr(new RKMPolyBoundingPlane(RandomUnit(g) * Uniform(g, 0.5, 3), c, Uniform(g, 0.05, 1.5)));
  case kCapsule:
    return BVPtr(new RKMPolyBoundingCylinder(c, RandomUnit(g) * Uniform(g, 0.5, 3), Uniform(g, 0.1, 1.5), Uniform(g, 0.1, 2.5)));
  default:
    return BVPtr(new RKMPolyBoundingCylinder(c, RandomUnit(g), Uniform(g, 0.1, 1.5), -1.0));
  }
}

// Per axis: half the time on a face (±1), otherwise anywhere between, so corners, edges and faces
// are all visited.
inline double BoundaryBiased(Rng &g)
{
  const double u = Uniform(g, 0, 1);
  return u < 0.25 ? -1.0 : (u < 0.5 ? 1.0 : Uniform(g, -1, 1));
}

inline RKMMathVector Perpendicular(const RKMMathVector &n)
{
  RKMMathVector p = n ^ (std::fabs(n.x) < 0.6 ? RKMMathVector(1, 0, 0) : RKMMathVector(0, 1, 0));
  p.Normalize();
  return p;
}

// A point strictly inside bv; along the unbounded directions of slabs and infinite cylinders, within
// `lateral` of the volume's origin.
inline RKMMathPoint SampleInside(Rng &g, const RKMPolyBoundingVolume &bv, double lateral = 20.0)
{
  const double radial = Uniform(g, 0, 1) < 0.5 ? kShrink : kShrink * std::cbrt(Uniform(g, 0, 1));
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
  {
    const RKMPolyBoxf &b = static_cast<const RKMPolyAABB &>(bv).GetBoxf();
    const double lo[3] = {b.GetXMin(), b.GetYMin(), b.GetZMin()}, hi[3] = {b.GetXMax(), b.GetYMax(), b.GetZMax()};
    RKMMathPoint p;
    for (int i = 0; i < 3; ++i)
      p[i] = 0.5 * (lo[i] + hi[i]) + 0.5 * (hi[i] - lo[i]) * kShrink * BoundaryBiased(g);
    return p;
  }
  case RKMPolyBoundingVolume::TypeSphere:
  {
    const auto &s = static_cast<const RKMPolyBoundingSphere &>(bv);
    return s.GetCenter() + RandomUnit(g) * (s.GetRadius() * radial);
  }
  case RKMPolyBoundingVolume::TypeOBB:
  {
    const auto &o = static_cast<const RKMPolyOBB &>(bv);
    const RKMMathVector h = o.Diagonal();
    return o.Center() + o.U() * (h.x * kShrink * BoundaryBiased(g)) + o.V() * (h.y * kShrink * BoundaryBiased(g)) +
           o.W() * (h.z * kShrink * BoundaryBiased(g));
  }
  case RKMPolyBoundingVolume::TypePlane:
  {
    const auto &s = static_cast<const RKMPolyBoundingPlane &>(bv);
    const RKMMathVector &n = s.GetNormal(), e1 = Perpendicular(n), e2 = n ^ e1;
    return s.GetOrigin() + n * (s.GetThickness() * kShrink * BoundaryBiased(g)) + e1 * Uniform(g, -lateral, lateral) +
           e2 * Uniform(g, -lateral, lateral);
  }
  default:
  {
    const auto &c = static_cast<const RKMPolyBoundingCylinder &>(bv);
    const double L = c.GetLimit() > 0.0 ? c.GetLimit() : lateral;
    return c.GetCenter() + c.GetDirection() * (L * kShrink * BoundaryBiased(g)) +
           RandomUnit(g) * (c.GetRadius() * radial);
  }
  }
}
}
