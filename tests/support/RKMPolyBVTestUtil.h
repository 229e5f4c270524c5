#pragma once

// Random geometry shared by the bounding-volume tests: rotations, transformations of the four
// families the placement code distinguishes, random volumes, points sampled strictly inside them, and
// the brute-force oriented-box oracles (local frame, corners), which use the box's data only.

#include "RKMMath3x3Matrix.h"
#include "RKMMathBox.h"
#include "RKMMathOBBBase.h"
#include "RKMMathTransformation.h"
#include "RKMPolyAABB.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBVProperties.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

#include <cmath>
#include <initializer_list>
#include <memory>
#include <random>
#include <vector>

namespace bvtest
{
using Rng = std::mt19937_64;
using BVPtr = std::unique_ptr<RKMPolyBoundingVolume>;
using BVs = std::initializer_list<const RKMPolyBoundingVolume *>;
using P = RKMPolyBVProperties;

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
  return RKMMath3x3Matrix(1 - 2 * (y * y + z * z), 2 * (x * y - w * z), 2 * (x * z + w * y), 2 * (x * y + w * z),
                          1 - 2 * (x * x + z * z), 2 * (y * z - w * x), 2 * (x * z - w * y), 2 * (y * z + w * x),
                          1 - 2 * (x * x + y * y));
}

enum class TKind
{
  Rigid,
  UniformScale,
  NonUniformScale,
  Shear
};
constexpr TKind kAllTKinds[] = {TKind::Rigid, TKind::UniformScale, TKind::NonUniformScale, TKind::Shear};

inline const char *Name(TKind k)
{
  static const char *const names[] = {"rigid", "uniform scale", "non-uniform scale", "shear"};
  return names[static_cast<int>(k)];
}

inline RKMMathTransformation RandomTransformation(Rng &g, TKind k)
{
  const RKMMath3x3Matrix R = RandomRotation(g);
  RKMMath3x3Matrix M = R;
  if (k == TKind::UniformScale)
  {
    // Reflections included: a negative scale must still scale lengths by |s|.
    const double s = Uniform(g, 0.2, 5.0) * (Uniform(g, 0, 1) < 0.3 ? -1.0 : 1.0);
    M = R * RKMMath3x3Matrix(s, 0, 0, 0, s, 0, 0, 0, s);
  }
  else if (k == TKind::NonUniformScale)
    M = R * RKMMath3x3Matrix(Uniform(g, 0.2, 4), 0, 0, 0, Uniform(g, 0.2, 4), 0, 0, 0, Uniform(g, 0.2, 4)) *
        RandomRotation(g);
  else if (k == TKind::Shear)
    M = R * RKMMath3x3Matrix(1, Uniform(g, -1.5, 1.5), Uniform(g, -1.5, 1.5), 0, 1, Uniform(g, -1.5, 1.5), 0, 0, 1);
  return RKMMathTransformation(M, RandomPoint(g, 5).AsVector());
}

// Kinds of random volume: the five types plus the infinite cylinder, which behaves apart.
enum VKind
{
  kAABB,
  kSphere,
  kOBB,
  kSlab,
  kCapsule,
  kInfiniteCylinder,
  kVKindCount
};

inline const char *Name(int k)
{
  static const char *const names[] = {"AABB", "sphere", "OBB", "slab", "capsule", "infinite cylinder"};
  return names[k];
}

inline bool Unbounded(int kind) { return kind == kSlab || kind == kInfiniteCylinder; }

inline BVPtr RandomVolume(Rng &g, int kind)
{
  const RKMMathPoint c = RandomPoint(g, 3);
  switch (kind)
  {
  case kAABB:
    return BVPtr(
        new RKMPolyAABB(RKMMathBox(c, c + RKMMathVector(Uniform(g, 0.1, 3), Uniform(g, 0.1, 3), Uniform(g, 0.1, 3)))));
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
    return BVPtr(
        new RKMPolyBoundingCylinder(c, RandomUnit(g) * Uniform(g, 0.5, 3), Uniform(g, 0.1, 1.5), Uniform(g, 0.1, 2.5)));
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

// A kind the library does not know: every question must get the neutral answer.
class UnknownBV : public RKMPolyBoundingVolume
{
public:
  HRESULT Accept(RKMPolyBVConstVisitor &) const override { return E_NOTIMPL; }
  TypeID GetTypeID() const override { return static_cast<TypeID>(7); }
};

inline BVPtr Clone(const RKMPolyBoundingVolume &bv) { return BVPtr(RKMPolyBVClone::Clone(&bv)); }

// The volume placed by T, made anew (a clone for no placement).
inline BVPtr Placed(const RKMPolyBoundingVolume &bv, const RKMMathTransformation *T)
{
  RKMPolyBoundingVolume *raw = nullptr;
  if (!T)
    return Clone(bv);
  return RKMPolyBVOperations::CreateTransformedInstance(bv, *T, raw) == S_OK ? BVPtr(raw) : nullptr;
}

// Bit-for-bit the same volume: "unchanged" is meant literally.
inline bool Same(const RKMPolyBoundingVolume &a, const RKMPolyBoundingVolume &b)
{
  using BV = RKMPolyBoundingVolume;
  if (a.GetTypeID() != b.GetTypeID())
    return false;
  if (a.GetTypeID() == BV::TypeAABB)
    return static_cast<const RKMPolyAABB &>(a) == static_cast<const RKMPolyAABB &>(b);
  if (a.GetTypeID() == BV::TypeSphere)
  {
    const auto &x = static_cast<const RKMPolyBoundingSphere &>(a), &y = static_cast<const RKMPolyBoundingSphere &>(b);
    return x.GetCenter() == y.GetCenter() && x.GetRadius() == y.GetRadius();
  }
  if (a.GetTypeID() == BV::TypeOBB)
  {
    const auto &x = static_cast<const RKMPolyOBB &>(a), &y = static_cast<const RKMPolyOBB &>(b);
    if (!x.IsDefined() || !y.IsDefined())
      return !x.IsDefined() && !y.IsDefined();
    return x.Center() == y.Center() && x.Diagonal() == y.Diagonal() && x.U() == y.U() && x.V() == y.V() &&
           x.W() == y.W();
  }
  if (a.GetTypeID() == BV::TypePlane)
  {
    const auto &x = static_cast<const RKMPolyBoundingPlane &>(a), &y = static_cast<const RKMPolyBoundingPlane &>(b);
    return x.GetNormal() == y.GetNormal() && x.GetOrigin() == y.GetOrigin() && x.GetThickness() == y.GetThickness() &&
           x.IsInfinitelyThick() == y.IsInfinitelyThick();
  }
  const auto &x = static_cast<const RKMPolyBoundingCylinder &>(a), &y = static_cast<const RKMPolyBoundingCylinder &>(b);
  return x.GetCenter() == y.GetCenter() && x.GetDirection() == y.GetDirection() && x.GetRadius() == y.GetRadius() &&
         x.GetLimit() == y.GetLimit();
}

// Oriented boxes, brute force from the box's own data.
inline RKMMathOBBBase RandomOBBBase(Rng &g, double spread = 5.0)
{
  const RKMMath3x3Matrix R = RandomRotation(g);
  const RKMMathVector axes[3] = {R.GetColumn(0), R.GetColumn(1), R.GetColumn(2)};
  return RKMMathOBBBase(axes, RKMMathVector(Uniform(g, 0.05, 2), Uniform(g, 0.05, 2), Uniform(g, 0.05, 2)),
                        RandomPoint(g, spread));
}

inline RKMMathOBBBase Moved(const RKMMathOBBBase &b, const RKMMathPoint &center)
{
  const RKMMathVector axes[3] = {b.U(), b.V(), b.W()};
  return RKMMathOBBBase(axes, b.Diagonal(), center);
}

inline RKMMathPoint FromLocal(const RKMMathOBBBase &b, double u, double v, double w)
{
  return b.Center() + b.U() * u + b.V() * v + b.W() * w;
}

inline RKMMathPoint Local(const RKMMathOBBBase &b, const RKMMathPoint &p)
{
  const RKMMathVector d = p - b.Center();
  return {d * b.U(), d * b.V(), d * b.W()};
}

inline bool Inside(const RKMMathOBBBase &b, const RKMMathPoint &p)
{
  const RKMMathPoint l = Local(b, p);
  return std::fabs(l.x) <= b.Diagonal().x && std::fabs(l.y) <= b.Diagonal().y && std::fabs(l.z) <= b.Diagonal().z;
}

inline std::vector<RKMMathPoint> Corners(const RKMMathOBBBase &b)
{
  std::vector<RKMMathPoint> c;
  const RKMMathVector h = b.Diagonal();
  for (int k = 0; k < 8; ++k)
    c.push_back(FromLocal(b, (k & 1 ? 1 : -1) * h.x, (k & 2 ? 1 : -1) * h.y, (k & 4 ? 1 : -1) * h.z));
  return c;
}

// Corner, edge, face and interior points, shrunk off the boundary.
inline RKMMathPoint SampleBox(Rng &g, const RKMMathOBBBase &b)
{
  const RKMMathVector h = b.Diagonal() * kShrink;
  return FromLocal(b, h.x * BoundaryBiased(g), h.y * BoundaryBiased(g), h.z * BoundaryBiased(g));
}
} // namespace bvtest
