#include "RKMPolyAABB.h"
#include "RKMPolyBVClone.h"
#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBoundingCylinder.h"
#include "RKMPolyBoundingPlane.h"
#include "RKMPolyBoundingSphere.h"
#include "RKMPolyBoundingVolume.h"
#include "RKMPolyOBB.h"
#include "RKMPolyPool.h"

#include "RKMMathBox.h"
#include "RKMMathTransformation.h"

#include <cmath>
#include <new>

RKMPolyBoundingVolume::~RKMPolyBoundingVolume() = default;

void *RKMPolyBoundingVolume::operator new(std::size_t size) noexcept
{
  return size > 0xFFFFFFFFu ? nullptr : RKMPolyPool::AllocateObjectInTSPool(static_cast<unsigned>(size));
}

void RKMPolyBoundingVolume::operator delete(void *p) noexcept { RKMPolyPool::FreeObjectFromPool(p); }

RKMPolyBVConstVisitor::~RKMPolyBVConstVisitor() = default;

HRESULT RKMPolyBVConstVisitor::Visit(const RKMPolyBoundingVolume &bv) { return bv.Accept(*this); }

HRESULT RKMPolyAABB::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }
HRESULT RKMPolyBoundingSphere::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }
HRESULT RKMPolyOBB::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }
HRESULT RKMPolyBoundingPlane::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }
HRESULT RKMPolyBoundingCylinder::Accept(RKMPolyBVConstVisitor &visitor) const
{
  return visitor.VisitConcrete(*this);
}

RKMPolyAABB::RKMPolyAABB(const RKMPolyAABB &other) : RKMPolyBoundingVolume(other), m_box(other.m_box) {}

RKMPolyAABB::RKMPolyAABB(const RKMPolyBoxf &box) : m_box(box) {}

RKMPolyAABB::RKMPolyAABB(const RKMMathBox &box) { m_box.SetBox(box); }

void RKMPolyAABB::SetMathBox(const RKMMathBox &box) { m_box.SetBox(box); }

unsigned char RKMPolyAABB::operator==(const RKMPolyAABB &other) const
{
  const bool e1 = m_box.IsEmpty(), e2 = other.m_box.IsEmpty();
  if (e1 || e2)
    return e1 && e2;
  return m_box.GetXMin() == other.m_box.GetXMin() && m_box.GetYMin() == other.m_box.GetYMin() &&
         m_box.GetZMin() == other.m_box.GetZMin() && m_box.GetXMax() == other.m_box.GetXMax() &&
         m_box.GetYMax() == other.m_box.GetYMax() && m_box.GetZMax() == other.m_box.GetZMax();
}

RKMPolyBoundingCylinder::RKMPolyBoundingCylinder(const RKMMathPoint &center, const RKMMathVector &direction,
                                                 double radius, double limit)
    : m_center(center), m_direction(direction), m_radius(radius), m_limit(limit)
{
  NormalizeDirection(m_direction);
}

void RKMPolyBoundingCylinder::Set(const RKMMathPoint &center, const RKMMathVector &direction, double radius,
                                  double limit)
{
  m_center = center;
  m_direction = direction;
  NormalizeDirection(m_direction);
  m_radius = radius;
  if (limit > 0.0)
    m_limit = limit;
}

void RKMPolyBoundingCylinder::NormalizeDirection(RKMMathVector &v)
{
  const double n2 = v.SquareNorm();
  if (n2 == 1.0)
    return;
  if (v.x == 0.0 && v.y == 0.0 && v.z == 0.0)
  {
    v = RKMMathVector(1.0, 0.0, 0.0);
    return;
  }
  // Where n² is a normal number, the plain rule; where it overflows or underflows (components beyond
  // about 1e154 or below 1e-154), the scaled norm, which keeps the direction.
  if (n2 > 1e-300 && n2 < 1e300)
  {
    const double k = 1.0 / std::sqrt(n2);
    v = RKMMathVector(v.x * k, v.y * k, v.z * k);
    return;
  }
  if (FAILED(v.Normalize()) && !(std::isnan(v.x) || std::isnan(v.y) || std::isnan(v.z)))
  {
    // Infinite components: the direction of the infinite ones.
    v = RKMMathVector(std::isinf(v.x) ? std::copysign(1.0, v.x) : 0.0, std::isinf(v.y) ? std::copysign(1.0, v.y) : 0.0,
                      std::isinf(v.z) ? std::copysign(1.0, v.z) : 0.0);
    v.Normalize();
  }
}

RKMPolyBoundingPlane::RKMPolyBoundingPlane(const RKMMathVector &normal, const RKMMathPoint &origin, double thickness)
    : m_normal(normal), m_origin(origin), m_thickness(std::fabs(thickness))
{
  m_normal.Normalize();
}

void RKMPolyBoundingPlane::SetNormal(const RKMMathVector &normal)
{
  m_normal = normal;
  m_normal.Normalize();
}

void RKMPolyBoundingPlane::SetThickness(double thickness) { m_thickness = std::fabs(thickness); }

void RKMPolyBoundingPlane::Inflate(double d)
{
  m_thickness += d;
  if (m_thickness < 0.0)
    m_thickness = 0.0;
}

void RKMPolyBoundingPlane::GetEquation(double &a, double &b, double &c, double &d) const
{
  a = m_normal.x;
  b = m_normal.y;
  c = m_normal.z;
  d = -(m_normal * m_origin.AsVector());
}

double RKMPolyBoundingPlane::DistanceTo(const RKMMathPoint &p) const
{
  if (m_infinitelyThick)
    return 0.0;
  return std::fmax(0.0, std::fabs(m_normal * (p - m_origin)) - m_thickness);
}

double RKMPolyBoundingPlane::SquareDistanceTo(const RKMMathPoint &p) const
{
  const double d = DistanceTo(p);
  return d * d;
}

RKMPolyBoundingPlane operator*(const RKMMathTransformation &T, const RKMPolyBoundingPlane &plane)
{
  RKMPolyBoundingPlane result;
  result.SetInfinitelyThick(plane.IsInfinitelyThick());
  result.SetOrigin(T * plane.GetOrigin());
  const RKMMath3x3Matrix &M = T.GetMatrix();
  const RKMMathVector c0 = M.GetColumn(0), c1 = M.GetColumn(1), c2 = M.GetColumn(2);
  // Only an exact similitude (orthogonal columns of one length, to the last bit) takes the simple rule;
  // a near one is placed by the general rule, which keeps its small distortion.
  if (c0 * c1 == 0.0 && c0 * c2 == 0.0 && c1 * c2 == 0.0 && c0 * c0 == c1 * c1 && c1 * c1 == c2 * c2 && c0 * c0 > 0.0)
  {
    const double s = std::sqrt(c0 * c0);
    // A similitude s·R maps the slab onto the slab of normal R·n and thickness |s|·t.
    result.SetNormal(M * plane.GetNormal());
    result.SetThickness(s * plane.GetThickness());
    return result;
  }
  // In general the image of {|n·(p − o)| ≤ t} is {|m·(q − T·o)| ≤ t} with m = M⁻ᵀ·n: its unit normal is
  // m / |m| and its thickness t / |m|. A singular M flattens the slab's complement away: all of space.
  RKMMath3x3Matrix inverse;
  if (FAILED(M.Inverse(inverse)))
  {
    result.SetNormal(plane.GetNormal());
    result.SetThickness(plane.GetThickness());
    result.SetInfinitelyThick(1);
    return result;
  }
  const RKMMathVector m = inverse.Transpose() * plane.GetNormal();
  const double length = m.Norm();
  result.SetNormal(m);
  // Rounded up by a few ulps: the slab must not lose the boundary of the image.
  result.SetThickness(plane.GetThickness() / length * (1.0 + 1e-14));
  return result;
}

RKMPolyOBB::RKMPolyOBB(const RKMMathBox &box) : m_base(box) {}

RKMPolyOBB::RKMPolyOBB(const RKMPolyBoxf &box) : m_base(box.GetMathBox()) {}

RKMMathBox RKMPolyOBB::GetAABB() const
{
  RKMMathBox box;
  m_base.GetBox(box);
  return box;
}

HRESULT RKMPolyOBB::ConvertToBoxAndTransformation(RKMMathBox &box, RKMMathTransformation &T) const
{
  return m_base.ConvertToBoxAndTransformation(box, T);
}

RKMPolyBoundingVolume *RKMPolyBVClone::Clone(const RKMPolyBoundingVolume *bv)
{
  if (!bv)
    return nullptr;
  RKMPolyBVClone visitor;
  visitor.Visit(*bv);
  return visitor.clone;
}

RKMPolyBVClone::~RKMPolyBVClone() { clone = nullptr; }

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyBoundingCylinder &bv)
{
  clone = new RKMPolyBoundingCylinder(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyBoundingPlane &bv)
{
  clone = new RKMPolyBoundingPlane(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyOBB &bv)
{
  clone = new RKMPolyOBB(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyAABB &bv)
{
  clone = new RKMPolyAABB(bv);
  return S_OK;
}

HRESULT RKMPolyBVClone::VisitConcrete(const RKMPolyBoundingSphere &bv)
{
  clone = new RKMPolyBoundingSphere(bv);
  return S_OK;
}
