#include "RKMPolyAABB.h"
#include "RKMPolyBVOperations.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyOBB.h"

#include "RKMMathBox.h"
#include "RKMMathTransformation.h"

#include <cmath>
#include <initializer_list>

namespace
{
// Relative growth of radii computed through a norm bound, covering the rounding of the placed points.
constexpr double kGrowth = 1e-13;

// The factor by which the linear part M of T can stretch a length. For an exact similitude s·R
// (MᵀM = s²·I to the last bit) it is |s|; otherwise √λmax(MᵀM), bounded by the largest absolute row sum
// of MᵀM (Gershgorin) and grown a little for rounding. A near-similitude is not rounded to one: its
// small distortion still stretches some lengths beyond |s|.
double StretchBound(const RKMMath3x3Matrix &M, bool &similitude)
{
  double G[3][3];
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      G[i][j] = M.GetColumn(i) * M.GetColumn(j);
  similitude = G[0][1] == 0.0 && G[0][2] == 0.0 && G[1][2] == 0.0 && G[0][0] == G[1][1] && G[1][1] == G[2][2] &&
               G[0][0] > 0.0;
  if (similitude)
    return std::sqrt(G[0][0]);
  double bound = 0.0;
  for (int i = 0; i < 3; ++i)
    bound = std::fmax(bound, std::fabs(G[i][0]) + std::fabs(G[i][1]) + std::fabs(G[i][2]));
  return std::sqrt(bound) * (1.0 + kGrowth);
}

// The sphere radius under T: for a similitude, the largest image of the three radius vectors (they
// are all |s|·r); otherwise the stretch bound. An empty sphere stays empty.
double PlacedRadius(const RKMMath3x3Matrix &M, double r)
{
  if (!(r >= 0.0))
    return r;
  bool similitude;
  const double stretch = StretchBound(M, similitude);
  if (!similitude)
    return r * stretch;
  double best = (M * RKMMathVector(r, 0, 0)).Norm();
  for (const RKMMathVector &v : {RKMMathVector(0, r, 0), RKMMathVector(0, 0, r)})
  {
    const double n = (M * v).Norm();
    if (n > best)
      best = n;
  }
  return best;
}

// The capsule placed by T: its axis segment maps onto the segment along M·a of half-length L·|M·a|,
// and the radius grows by at most the stretch of M.
void PlacedCylinder(const RKMPolyBoundingCylinder &c, const RKMMathTransformation &T, RKMMathPoint &center,
                    RKMMathVector &direction, double &radius, double &limit)
{
  bool similitude;
  const RKMMath3x3Matrix &M = T.GetMatrix();
  const double stretch = StretchBound(M, similitude);
  center = T * c.GetCenter();
  direction = M * c.GetDirection();
  const double axisStretch = similitude ? stretch : direction.Norm() * (1.0 + kGrowth);
  radius = c.GetRadius() >= 0.0 ? c.GetRadius() * stretch : c.GetRadius();
  limit = c.GetLimit() > 0.0 ? c.GetLimit() * axisStretch : c.GetLimit();
}

double Down(double v) { return std::nextafter(v, -HUGE_VAL); }
double Up(double v) { return std::nextafter(v, HUGE_VAL); }
}

HRESULT RKMPolyBVOperations::CreateTransformedInstance(const RKMPolyBoundingVolume &bv,
                                                      const RKMMathTransformation &T,
                                                      RKMPolyBoundingVolume *&result)
{
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return CreateAABBTI(bv, T, result);
  case RKMPolyBoundingVolume::TypeSphere:
    return CreateSphereTI(bv, T, result);
  case RKMPolyBoundingVolume::TypeOBB:
    return CreateOBBTI(bv, T, result);
  case RKMPolyBoundingVolume::TypePlane:
    return CreatePlaneTI(bv, T, result);
  case RKMPolyBoundingVolume::TypeCylinder:
    return CreateCylinderTI(bv, T, result);
  }
  return E_NOTIMPL;
}

HRESULT RKMPolyBVOperations::CreateAABBTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                         RKMPolyBoundingVolume *&result)
{
  const RKMPolyAABB &box = static_cast<const RKMPolyAABB &>(bv);
  RKMPolyBoundingVolume *created;
  if (T.IsIdentity())
    created = new RKMPolyAABB(box);
  else
    created = new RKMPolyOBB(T * RKMMathOBBBase(box.GetBoxf().GetMathBox()));
  if (!created)
    return E_OUTOFMEMORY;
  result = created;
  return S_OK;
}

HRESULT RKMPolyBVOperations::CreateSphereTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                           RKMPolyBoundingVolume *&result)
{
  RKMPolyBoundingSphere *created = new RKMPolyBoundingSphere(static_cast<const RKMPolyBoundingSphere &>(bv));
  if (!created)
    return E_OUTOFMEMORY;
  TransformSphere(*created, T);
  result = created;
  return S_OK;
}

HRESULT RKMPolyBVOperations::CreateOBBTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                        RKMPolyBoundingVolume *&result)
{
  RKMPolyOBB *created = new RKMPolyOBB(static_cast<const RKMPolyOBB &>(bv));
  if (!created)
    return E_OUTOFMEMORY;
  TransformOBB(*created, T);
  result = created;
  return S_OK;
}

HRESULT RKMPolyBVOperations::CreatePlaneTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                          RKMPolyBoundingVolume *&result)
{
  RKMPolyBoundingPlane *created = new RKMPolyBoundingPlane;
  if (!created)
    return E_OUTOFMEMORY;
  *created = T * static_cast<const RKMPolyBoundingPlane &>(bv);
  result = created;
  return S_OK;
}

HRESULT RKMPolyBVOperations::CreateCylinderTI(const RKMPolyBoundingVolume &bv, const RKMMathTransformation &T,
                                             RKMPolyBoundingVolume *&result)
{
  RKMPolyBoundingCylinder *created = new RKMPolyBoundingCylinder;
  if (!created)
    return E_OUTOFMEMORY;
  RKMMathPoint center;
  RKMMathVector direction;
  double radius, limit;
  PlacedCylinder(static_cast<const RKMPolyBoundingCylinder &>(bv), T, center, direction, radius, limit);
  // Set keeps the default infinite limit for a limit ≤ 0.
  created->Set(center, direction, radius, limit);
  result = created;
  return S_OK;
}

HRESULT RKMPolyBVOperations::Transform(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T)
{
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    return TransformAABB(bv, T);
  case RKMPolyBoundingVolume::TypeSphere:
    return TransformSphere(bv, T);
  case RKMPolyBoundingVolume::TypeOBB:
    return TransformOBB(bv, T);
  case RKMPolyBoundingVolume::TypePlane:
    return TransformPlane(bv, T);
  case RKMPolyBoundingVolume::TypeCylinder:
    return TransformCylinder(bv, T);
  }
  return E_NOTIMPL;
}

HRESULT RKMPolyBVOperations::TransformAABB(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T)
{
  if (T.IsIdentity())
    return S_OK;
  RKMPolyAABB &box = static_cast<RKMPolyAABB &>(bv);
  const RKMPolyOBB placed(T * RKMMathOBBBase(box.GetBoxf().GetMathBox()));
  box.SetMathBox(placed.GetAABB());
  return S_OK;
}

HRESULT RKMPolyBVOperations::TransformSphere(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T)
{
  RKMPolyBoundingSphere &s = static_cast<RKMPolyBoundingSphere &>(bv);
  s.Set(T * s.GetCenter(), PlacedRadius(T.GetMatrix(), s.GetRadius()));
  return S_OK;
}

HRESULT RKMPolyBVOperations::TransformOBB(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T)
{
  RKMPolyOBB &obb = static_cast<RKMPolyOBB &>(bv);
  obb.GetBase() = T * obb.GetBase();
  return S_OK;
}

HRESULT RKMPolyBVOperations::TransformPlane(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T)
{
  RKMPolyBoundingPlane &p = static_cast<RKMPolyBoundingPlane &>(bv);
  p = T * p;
  return S_OK;
}

HRESULT RKMPolyBVOperations::TransformCylinder(RKMPolyBoundingVolume &bv, const RKMMathTransformation &T)
{
  RKMPolyBoundingCylinder &c = static_cast<RKMPolyBoundingCylinder &>(bv);
  RKMMathPoint center;
  RKMMathVector direction;
  double radius, limit;
  PlacedCylinder(c, T, center, direction, radius, limit);
  // Assigned whole, so that a limit of 0 stays 0 (Set would keep the old one).
  c = RKMPolyBoundingCylinder(center, direction, radius, limit);
  return S_OK;
}

HRESULT RKMPolyBVOperations::Inflate(RKMPolyBoundingVolume &bv, double d)
{
  if (!(d > 0.0))
    return S_OK;
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
  {
    RKMPolyAABB &a = static_cast<RKMPolyAABB &>(bv);
    RKMPolyBoxf box = a.GetBoxf();
    box.Inflate(d);
    a.SetBoxf(box);
    return S_OK;
  }
  case RKMPolyBoundingVolume::TypeSphere:
  {
    RKMPolyBoundingSphere &s = static_cast<RKMPolyBoundingSphere &>(bv);
    // An empty sphere stays empty: inflating nothing gives nothing.
    if (s.GetRadius() >= 0.0)
      s.Set(s.GetCenter(), s.GetRadius() + d);
    return S_OK;
  }
  case RKMPolyBoundingVolume::TypeOBB:
    static_cast<RKMPolyOBB &>(bv).Inflate(d);
    return S_OK;
  case RKMPolyBoundingVolume::TypePlane:
    static_cast<RKMPolyBoundingPlane &>(bv).Inflate(d);
    return S_OK;
  case RKMPolyBoundingVolume::TypeCylinder:
  {
    RKMPolyBoundingCylinder &c = static_cast<RKMPolyBoundingCylinder &>(bv);
    if (c.GetRadius() >= 0.0)
      c.Set(c.GetCenter(), c.GetDirection(), c.GetRadius() + d, c.GetLimit());
    return S_OK;
  }
  }
  return S_OK;
}

HRESULT RKMPolyBVOperations::GetEnclosingBox(const RKMPolyBoundingVolume &bv, RKMMathBox &box)
{
  switch (bv.GetTypeID())
  {
  case RKMPolyBoundingVolume::TypeAABB:
    box = static_cast<const RKMPolyAABB &>(bv).GetBoxf().GetMathBox();
    return S_OK;
  case RKMPolyBoundingVolume::TypeSphere:
  {
    const RKMPolyBoundingSphere &s = static_cast<const RKMPolyBoundingSphere &>(bv);
    const RKMMathPoint &c = s.GetCenter();
    const double r = s.GetRadius();
    // Rounded outward: c ± r may round toward the centre.
    box = RKMMathBox(Down(c.x - r), Up(c.x + r), Down(c.y - r), Up(c.y + r), Down(c.z - r), Up(c.z + r));
    return S_OK;
  }
  case RKMPolyBoundingVolume::TypeOBB:
    box = static_cast<const RKMPolyOBB &>(bv).GetAABB();
    return S_OK;
  case RKMPolyBoundingVolume::TypePlane:
    return E_FAIL;
  case RKMPolyBoundingVolume::TypeCylinder:
  {
    const RKMPolyBoundingCylinder &c = static_cast<const RKMPolyBoundingCylinder &>(bv);
    // A limit of 0 reads as infinite, as in the point and ray tests: no finite box holds it.
    if (!(c.GetLimit() > 0.0))
      return E_FAIL;
    const RKMMathPoint &o = c.GetCenter();
    const RKMMathVector &a = c.GetDirection();
    double e[3];
    for (int i = 0; i < 3; ++i)
      e[i] = std::fabs(a[i]) * c.GetLimit() + c.GetRadius();
    box = RKMMathBox(Down(o.x - e[0]), Up(o.x + e[0]), Down(o.y - e[1]), Up(o.y + e[1]), Down(o.z - e[2]),
                     Up(o.z + e[2]));
    return S_OK;
  }
  }
  return E_NOTIMPL;
}

HRESULT RKMPolyBVOperations::GetEnclosingBox(const RKMPolyBoundingVolume &bv, RKMMathBox &box,
                                            const RKMMathTransformation *T)
{
  if (!T)
    return GetEnclosingBox(bv, box);
  RKMPolyBoundingVolume *placed = nullptr;
  const HRESULT hr = CreateTransformedInstance(bv, *T, placed);
  if (FAILED(hr))
    return hr;
  if (!placed)
    return E_FAIL;
  const HRESULT result = GetEnclosingBox(*placed, box);
  delete placed;
  return result;
}
