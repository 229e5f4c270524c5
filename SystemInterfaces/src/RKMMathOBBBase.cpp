#include "RKMMathOBBBase.h"

#include "RKMMathConstants.h"
#include "RKMMathTransformation.h"

#include <cfloat>
#include <cmath>

namespace
{
// Relative slack that covers the rounding of the few dot products and sums behind each answer; every
// test leans by it toward the safe answer.
constexpr double kSlack = 64 * DBL_EPSILON;
// Added to |cos| between axes: near-parallel axes make the cross-product axes degenerate, and without
// it rounding could invent a separating axis.
constexpr double kParallel = 1e-12;
// Half-size of the box that stands for "anywhere" when the input was not finite.
constexpr double kUnbounded = 1e300;

double Norm1(const RKMMathVector &v) { return std::fabs(v.x) + std::fabs(v.y) + std::fabs(v.z); }
double Norm1(const RKMMathPoint &p) { return std::fabs(p.x) + std::fabs(p.y) + std::fabs(p.z); }

double HalfSum(const RKMMathVector &h) { return h.x + h.y + h.z; }

// The separating-axis frame of box b seen from box a: R[i][j] = Ai·Bj, t the centre offset along a's
// axes. visit(projection, ra, rb, slack, cosine) is called for the 3 + 3 face axes (cosine 0) and the
// 9 cross axes Ai × Bj (cosine Ai·Bj, whose length is √(1 − cosine²)), until it returns false; the
// result is whether it never did. |R| is padded against near-parallel axes, so that rounding never
// invents a separating axis.
template <class Visit>
bool ForEachSeparatingAxis(const RKMMathOBBBase &A, const RKMMathOBBBase &B, Visit visit)
{
  double R[3][3], AbsR[3][3], t[3];
  const RKMMathVector d = B.Center() - A.Center();
  for (int i = 0; i < 3; ++i)
  {
    t[i] = d * A.Axis(i);
    for (int j = 0; j < 3; ++j)
    {
      R[i][j] = A.Axis(i) * B.Axis(j);
      AbsR[i][j] = std::fabs(R[i][j]) + kParallel;
    }
  }
  const double *a = &A.Diagonal().x, *b = &B.Diagonal().x;
  const double slack = kSlack * (Norm1(d) + HalfSum(A.Diagonal()) + HalfSum(B.Diagonal()));
  for (int i = 0; i < 3; ++i)
    if (!visit(t[i], a[i], b[0] * AbsR[i][0] + b[1] * AbsR[i][1] + b[2] * AbsR[i][2], slack, 0.0))
      return false;
  for (int j = 0; j < 3; ++j)
    if (!visit(t[0] * R[0][j] + t[1] * R[1][j] + t[2] * R[2][j],
               a[0] * AbsR[0][j] + a[1] * AbsR[1][j] + a[2] * AbsR[2][j], b[j], slack, 0.0))
      return false;
  for (int i = 0; i < 3; ++i)
  {
    const int i1 = (i + 1) % 3, i2 = (i + 2) % 3;
    for (int j = 0; j < 3; ++j)
    {
      const int j1 = (j + 1) % 3, j2 = (j + 2) % 3;
      if (!visit(t[i2] * R[i1][j] - t[i1] * R[i2][j], a[i1] * AbsR[i2][j] + a[i2] * AbsR[i1][j],
                 b[j1] * AbsR[i][j2] + b[j2] * AbsR[i][j1], slack, R[i][j]))
        return false;
    }
  }
  return true;
}
}

RKMMathOBBBase::RKMMathOBBBase()
    : m_axes{{1, 0, 0}, {0, 1, 0}, {0, 0, 1}}, m_half(-1.0, -1.0, -1.0), m_center(0, 0, 0)
{
}

RKMMathOBBBase::RKMMathOBBBase(const RKMMathBox &box) : RKMMathOBBBase()
{
  double l[6];
  if (FAILED(box.GetLimits(l[0], l[1], l[2], l[3], l[4], l[5])))
    return;
  m_center = RKMMathPoint(0.5 * l[0] + 0.5 * l[1], 0.5 * l[2] + 0.5 * l[3], 0.5 * l[4] + 0.5 * l[5]);
  // The half-extent is measured from the rounded centre to the farther limit, so the box keeps both.
  for (int i = 0; i < 3; ++i)
  {
    const double c = m_center[i];
    const double h = std::fmax(c - l[2 * i], l[2 * i + 1] - c);
    m_half[i] = h + kSlack * (std::fabs(c) + h);
  }
}

RKMMathOBBBase::RKMMathOBBBase(const RKMMathVector axes[3], const RKMMathVector &halfSizes, const RKMMathPoint &center)
    : m_axes{axes[0], axes[1], axes[2]}, m_half(halfSizes), m_center(center)
{
}

unsigned char RKMMathOBBBase::IsContaining(const RKMMathPoint &p, double tolerance) const
{
  if (!IsDefined())
    return 0;
  const RKMMathVector d = p - m_center;
  const double slack = kSlack * (Norm1(d) + HalfSum(m_half));
  for (int i = 0; i < 3; ++i)
    if (!(std::fabs(d * m_axes[i]) <= m_half[i] + tolerance + slack))
      return 0;
  return 1;
}

unsigned char RKMMathOBBBase::IsIntersecting(const RKMMathOBBBase &b) const
{
  if (!IsDefined() || !b.IsDefined())
    return 0;
  // Stops at the first axis that separates. Along a cross-product axis every term scales with the
  // axis' length (at most 1), so the unscaled slack is on the safe side there too.
  return ForEachSeparatingAxis(*this, b, [](double projection, double ra, double rb, double slack, double) {
    return !(std::fabs(projection) > ra + rb + slack);
  });
}

void RKMMathOBBBase::Inflate(double d)
{
  if (!IsDefined())
    return;
  m_half += RKMMathVector(d, d, d);
  if (m_half.x < 0.0 || m_half.y < 0.0 || m_half.z < 0.0)
    m_half = RKMMathVector(-1.0, -1.0, -1.0);
}

double RKMMathOBBBase::SquareDistanceTo(const RKMMathPoint &p) const
{
  if (!IsDefined())
    return RKMdoubleMax;
  const RKMMathVector d = p - m_center;
  double s = 0.0;
  for (int i = 0; i < 3; ++i)
  {
    const double excess = std::fabs(d * m_axes[i]) - m_half[i];
    if (excess > 0.0)
      s += excess * excess;
  }
  // Leans low by the rounding of the projections.
  const double slack = kSlack * (Norm1(d) + HalfSum(m_half));
  const double root = std::sqrt(s) - slack;
  return root > 0.0 ? root * root : 0.0;
}

double RKMMathOBBBase::SquareDistanceTo(const RKMMathOBBBase &b) const
{
  if (!IsDefined() || !b.IsDefined())
    return RKMdoubleMax;
  // The largest gap over the 15 axes, each gap divided by its axis' length (sin of the angle between
  // the two box axes it crosses); nearly parallel pairs add nothing the face axes miss.
  double gap = 0.0;
  ForEachSeparatingAxis(*this, b, [&gap](double projection, double ra, double rb, double slack, double cosine) {
    const double length = std::sqrt(std::fmax(0.0, 1.0 - cosine * cosine));
    if (length >= 1e-6)
    {
      const double g = (std::fabs(projection) - ra - rb - slack) / length;
      if (g > gap)
        gap = g;
    }
    return true;
  });
  if (std::isnan(gap))
    return 0.0;
  return gap * gap;
}

double RKMMathOBBBase::MaxSquareDistanceTo(const RKMMathPoint &p) const
{
  if (!IsDefined())
    return -1.0;
  // The farthest point of a box from p is a corner: per axis, the side away from p.
  const RKMMathVector d = p - m_center;
  double s = 0.0;
  for (int i = 0; i < 3; ++i)
  {
    const double far = std::fabs(d * m_axes[i]) + m_half[i];
    s += far * far;
  }
  const double root = std::sqrt(s) * (1.0 + kSlack) + kSlack * Norm1(m_center);
  return root * root;
}

double RKMMathOBBBase::MaxSquareDistanceTo(const RKMMathOBBBase &other) const
{
  if (!IsDefined() || !other.IsDefined())
    return -1.0;
  RKMMathPoint corners[8];
  other.GetCorners(corners);
  double best = 0.0;
  for (const RKMMathPoint &c : corners)
    best = std::fmax(best, MaxSquareDistanceTo(c));
  const double root = std::sqrt(best) * (1.0 + kSlack) + kSlack * Norm1(other.m_center);
  return root * root;
}

RKMMathPoint RKMMathOBBBase::UVWtoXYZ(const RKMMathPoint &uvw) const
{
  return m_center + m_axes[0] * uvw.x + m_axes[1] * uvw.y + m_axes[2] * uvw.z;
}

RKMMathPoint RKMMathOBBBase::XYZtoUVW(const RKMMathPoint &xyz) const
{
  const RKMMathVector d = xyz - m_center;
  return {d * m_axes[0], d * m_axes[1], d * m_axes[2]};
}

void RKMMathOBBBase::GetBox(RKMMathBox &box) const
{
  if (!IsDefined())
  {
    box = RKMMathBox();
    return;
  }
  double lo[3], hi[3];
  for (int i = 0; i < 3; ++i)
  {
    const double e = std::fabs(m_axes[0][i]) * m_half.x + std::fabs(m_axes[1][i]) * m_half.y +
                     std::fabs(m_axes[2][i]) * m_half.z;
    const double grown = e * (1.0 + kSlack);
    lo[i] = std::nextafter(m_center[i] - grown, -HUGE_VAL);
    hi[i] = std::nextafter(m_center[i] + grown, HUGE_VAL);
  }
  box = RKMMathBox(lo[0], hi[0], lo[1], hi[1], lo[2], hi[2]);
}

HRESULT RKMMathOBBBase::ConvertToBoxAndTransformation(RKMMathBox &box, RKMMathTransformation &T) const
{
  if (!IsDefined())
  {
    box = RKMMathBox();
    T = RKMMathTransformation();
    return E_FAIL;
  }
  box = RKMMathBox(-m_half.x, m_half.x, -m_half.y, m_half.y, -m_half.z, m_half.z);
  T = RKMMathTransformation(RKMMath3x3Matrix::FromColumns(m_axes[0], m_axes[1], m_axes[2]), m_center.AsVector());
  return S_OK;
}

HRESULT RKMMathOBBBase::Absorb(const RKMMathOBBBase &other)
{
  if (!other.IsDefined())
    return S_FALSE;
  if (!IsDefined())
  {
    *this = other;
    return S_OK;
  }
  RKMMathPoint corners[8];
  other.GetCorners(corners);
  double lo[3] = {-m_half.x, -m_half.y, -m_half.z}, hi[3] = {m_half.x, m_half.y, m_half.z};
  bool inside = true;
  double scale = Norm1(m_center) + HalfSum(m_half);
  for (const RKMMathPoint &c : corners)
  {
    const RKMMathPoint local = XYZtoUVW(c);
    scale = std::fmax(scale, Norm1(c));
    for (int i = 0; i < 3; ++i)
    {
      if (local[i] < lo[i]) { lo[i] = local[i]; inside = false; }
      if (local[i] > hi[i]) { hi[i] = local[i]; inside = false; }
    }
  }
  if (inside)
    return S_FALSE;
  const RKMMathPoint mid(0.5 * (lo[0] + hi[0]), 0.5 * (lo[1] + hi[1]), 0.5 * (lo[2] + hi[2]));
  // Mapping the corners and the new centre rounds; the slack covers it so both boxes stay inside.
  const double slack = kSlack * scale;
  for (int i = 0; i < 3; ++i)
    m_half[i] = 0.5 * (hi[i] - lo[i]) + slack;
  m_center = UVWtoXYZ(mid);
  return S_OK;
}

void RKMMathOBBBase::GetCorners(RKMMathPoint corners[8]) const
{
  for (int k = 0; k < 8; ++k)
  {
    const double su = (k & 1) ? 1.0 : -1.0, sv = (k & 2) ? 1.0 : -1.0, sw = (k & 4) ? 1.0 : -1.0;
    corners[k] = m_center + m_axes[0] * (su * m_half.x) + m_axes[1] * (sv * m_half.y) + m_axes[2] * (sw * m_half.z);
  }
}

RKMMathOBBBase operator*(const RKMMathTransformation &T, const RKMMathOBBBase &box)
{
  if (!box.IsDefined())
    return box;
  const RKMMath3x3Matrix &M = T.GetMatrix();
  // The image is the parallelepiped spanned by the mapped half-axes e[k]. An orthonormal frame q is
  // built from them (Gram–Schmidt, with any perpendicular standing in for a degenerate one), and the
  // half-size along q[i] is the parallelepiped's exact support Σk |e[k]·q[i]|: the box encloses the
  // image under any linear part, scaling and shear included, and is the image itself when T is rigid.
  RKMMathVector e[3];
  for (int k = 0; k < 3; ++k)
    e[k] = M * box.Axis(k) * box.Diagonal()[k];
  const RKMMathPoint center = T * box.Center();
  // A rigid linear part maps the axes onto orthonormal ones: the image is the box itself, with the
  // half-sizes grown by the tiny departure from orthonormality that rounding leaves.
  const RKMMathVector m0 = M * box.Axis(0), m1 = M * box.Axis(1), m2 = M * box.Axis(2);
  const double rigidity = std::fmax(std::fmax(std::fabs(m0 * m0 - 1.0), std::fabs(m1 * m1 - 1.0)),
                                    std::fmax(std::fabs(m2 * m2 - 1.0), std::fmax(std::fabs(m0 * m1),
                                                                                  std::fmax(std::fabs(m0 * m2), std::fabs(m1 * m2)))));
  if (rigidity <= 1e-12 && std::isfinite(center.x) && std::isfinite(center.y) && std::isfinite(center.z))
  {
    const RKMMathVector axes[3] = {m0, m1, m2};
    const RKMMathVector &h = box.Diagonal();
    // A cross term u_i·(m_i·m_j) can carry up to 1e-12 of any half-size into axis j.
    const double grow = 1.0 + 4e-12, pad = 4e-12 * HalfSum(h) + kSlack * Norm1(center);
    return RKMMathOBBBase(axes, RKMMathVector(h.x * grow + pad, h.y * grow + pad, h.z * grow + pad), center);
  }
  bool finite = std::isfinite(center.x) && std::isfinite(center.y) && std::isfinite(center.z);
  double largest = 0.0;
  for (int k = 0; k < 3; ++k)
  {
    finite = finite && std::isfinite(e[k].x) && std::isfinite(e[k].y) && std::isfinite(e[k].z);
    largest = std::fmax(largest, e[k].Norm());
  }
  if (!finite)
  {
    const RKMMathVector world[3] = {{1, 0, 0}, {0, 1, 0}, {0, 0, 1}};
    return RKMMathOBBBase(world, RKMMathVector(kUnbounded, kUnbounded, kUnbounded), RKMMathPoint(0, 0, 0));
  }
  RKMMathVector q[3];
  const double tiny = largest * 1e-9;
  q[0] = e[0];
  if (!(q[0].Norm() > tiny) || FAILED(q[0].Normalize()))
    q[0] = M * box.Axis(0);
  if (FAILED(q[0].Normalize()))
    q[0] = box.Axis(0);
  q[1] = e[1] - q[0] * (e[1] * q[0]);
  if (!(q[1].Norm() > tiny) || FAILED(q[1].Normalize()))
  {
    // Any unit vector perpendicular to q[0]: cross it with the world axis it is least aligned with.
    const RKMMathVector &a = q[0];
    const RKMMathVector pick = (std::fabs(a.x) <= std::fabs(a.y) && std::fabs(a.x) <= std::fabs(a.z))
                                   ? RKMMathVector(1, 0, 0)
                                   : (std::fabs(a.y) <= std::fabs(a.z) ? RKMMathVector(0, 1, 0) : RKMMathVector(0, 0, 1));
    q[1] = a ^ pick;
    q[1].Normalize();
  }
  q[2] = q[0] ^ q[1];
  q[2].Normalize();
  RKMMathVector half;
  for (int i = 0; i < 3; ++i)
  {
    const double h = std::fabs(e[0] * q[i]) + std::fabs(e[1] * q[i]) + std::fabs(e[2] * q[i]);
    half[i] = h * (1.0 + kSlack) + kSlack * Norm1(center);
  }
  return RKMMathOBBBase(q, half, center);
}
