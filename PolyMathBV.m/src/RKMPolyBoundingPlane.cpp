#include "RKMPolyBVConstVisitor.h"
#include "RKMPolyBoundingPlane.h"

#include "RKMMathTransformation.h"

#include <cmath>

HRESULT RKMPolyBoundingPlane::Accept(RKMPolyBVConstVisitor &visitor) const { return visitor.VisitConcrete(*this); }

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
