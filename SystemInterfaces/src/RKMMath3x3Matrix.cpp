#include "RKMMath3x3Matrix.h"

#include <cmath>

RKMMath3x3Matrix::RKMMath3x3Matrix() : m{{1, 0, 0}, {0, 1, 0}, {0, 0, 1}} {}

RKMMath3x3Matrix::RKMMath3x3Matrix(double a00, double a01, double a02, double a10, double a11, double a12,
                                   double a20, double a21, double a22)
    : m{{a00, a01, a02}, {a10, a11, a12}, {a20, a21, a22}}
{
}

RKMMath3x3Matrix RKMMath3x3Matrix::FromColumns(const RKMMathVector &c0, const RKMMathVector &c1,
                                               const RKMMathVector &c2)
{
  return RKMMath3x3Matrix(c0.x, c1.x, c2.x, c0.y, c1.y, c2.y, c0.z, c1.z, c2.z);
}

RKMMath3x3Matrix RKMMath3x3Matrix::operator*(const RKMMath3x3Matrix &b) const
{
  RKMMath3x3Matrix r;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      r.m[i][j] = m[i][0] * b.m[0][j] + m[i][1] * b.m[1][j] + m[i][2] * b.m[2][j];
  return r;
}

bool RKMMath3x3Matrix::operator==(const RKMMath3x3Matrix &b) const
{
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      if (m[i][j] != b.m[i][j])
        return false;
  return true;
}

RKMMath3x3Matrix RKMMath3x3Matrix::Transpose() const
{
  return RKMMath3x3Matrix(m[0][0], m[1][0], m[2][0], m[0][1], m[1][1], m[2][1], m[0][2], m[1][2], m[2][2]);
}

double RKMMath3x3Matrix::Determinant() const
{
  return GetRow(0) * (GetRow(1) ^ GetRow(2));
}

namespace
{
// The power of two that brings the largest entry into [0.5, 1), or 0 when an entry is not finite or
// all are zero. Scaling by it is exact (short of underflow of much smaller entries), so a determinant
// or an inverse computed on the scaled matrix neither overflows nor underflows for regular matrices
// of any magnitude.
double ScaleToUnit(const double (&m)[3][3])
{
  double largest = 0.0;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
    {
      if (!std::isfinite(m[i][j]))
        return 0.0;
      largest = std::fmax(largest, std::fabs(m[i][j]));
    }
  if (largest == 0.0)
    return 0.0;
  int e;
  std::frexp(largest, &e);
  return std::ldexp(1.0, -e);
}

RKMMath3x3Matrix Scaled(const RKMMath3x3Matrix &a, double s)
{
  RKMMath3x3Matrix r = a;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      r(i, j) *= s;
  return r;
}
}

HRESULT RKMMath3x3Matrix::Inverse(RKMMath3x3Matrix &out) const
{
  const double s = ScaleToUnit(m);
  if (s == 0.0)
    return E_FAIL;
  const RKMMath3x3Matrix a = Scaled(*this, s);
  RKMMathVector r0 = a.GetRow(0), r1 = a.GetRow(1), r2 = a.GetRow(2);
  RKMMathVector c0 = r1 ^ r2, c1 = r2 ^ r0, c2 = r0 ^ r1;
  double det = r0 * c0;
  // Hadamard: |det| ≤ |r0|·|r1|·|r2|. A determinant this small relative to that bound is lost in
  // rounding, and the inverse would be noise.
  double bound = r0.Norm() * r1.Norm() * r2.Norm();
  if (!std::isfinite(det) || !(std::fabs(det) > 1e-14 * bound))
    return E_FAIL;
  // (s·M)⁻¹ = M⁻¹ / s.
  RKMMath3x3Matrix inv = Scaled(FromColumns(c0 / det, c1 / det, c2 / det), s);
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      if (!std::isfinite(inv.m[i][j]))
        return E_FAIL;
  out = inv;
  return S_OK;
}

unsigned char RKMMath3x3Matrix::IsIdentity() const { return *this == RKMMath3x3Matrix(); }

unsigned char RKMMath3x3Matrix::IsScaling(double *scale) const
{
  double s = m[0][0];
  double mag = std::fmax(std::fabs(m[0][0]), std::fmax(std::fabs(m[1][1]), std::fabs(m[2][2])));
  if (!(mag > 0.0) || !std::isfinite(mag))
    return 0;
  double tol = 1e-12 * mag;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
    {
      double expected = (i == j) ? s : 0.0;
      if (!(std::fabs(m[i][j] - expected) <= tol))
        return 0;
    }
  if (scale)
    *scale = s;
  return 1;
}

unsigned char RKMMath3x3Matrix::IsSimilitude(double &scale) const
{
  const double unit = ScaleToUnit(m);
  if (unit == 0.0)
    return 0;
  const RKMMath3x3Matrix a = Scaled(*this, unit);
  const double det = a.Determinant();
  if (det == 0.0)
    return 0;
  const double s = std::cbrt(det);
  const double s2 = s * s;
  // MᵀM must be s²·I: columns orthogonal and all of squared length s².
  RKMMathVector c[3] = {a.GetColumn(0), a.GetColumn(1), a.GetColumn(2)};
  const double tol = 1e-9 * s2;
  for (int i = 0; i < 3; ++i)
    for (int j = i; j < 3; ++j)
    {
      const double expected = (i == j) ? s2 : 0.0;
      if (!(std::fabs(c[i] * c[j] - expected) <= tol))
        return 0;
    }
  scale = s / unit;
  return 1;
}

int RKMMath3x3Matrix::MakeIsometry(RKMMath3x3Matrix &out) const
{
  // Newton's iteration for the polar factor, Q ← (γQ + Q⁻ᵀ/γ)/2, converges to the orthogonal matrix
  // nearest to M and keeps the sign of the determinant. The Frobenius scaling γ = √(|Q⁻¹|/|Q|) makes
  // it converge in a few steps however ill-conditioned M is; it is dropped near convergence, where it
  // is 1 to rounding anyway.
  const double unit = ScaleToUnit(m);
  if (unit == 0.0)
    return 0;
  RKMMath3x3Matrix q = Scaled(*this, unit);
  bool scaling = true;
  for (int iter = 0; iter < 100; ++iter)
  {
    RKMMath3x3Matrix inv;
    if (FAILED(q.Inverse(inv)))
      return 0;
    double nq = 0.0, ni = 0.0;
    for (int i = 0; i < 3; ++i)
      for (int j = 0; j < 3; ++j)
      {
        nq += q.m[i][j] * q.m[i][j];
        ni += inv.m[i][j] * inv.m[i][j];
      }
    double g = scaling ? std::sqrt(std::sqrt(ni / nq)) : 1.0;
    if (!std::isfinite(g) || !(g > 0.0))
      g = 1.0;
    RKMMath3x3Matrix next;
    double change = 0.0;
    for (int i = 0; i < 3; ++i)
      for (int j = 0; j < 3; ++j)
      {
        next.m[i][j] = 0.5 * (g * q.m[i][j] + inv.m[j][i] / g);
        change = std::fmax(change, std::fabs(next.m[i][j] - q.m[i][j]));
      }
    q = next;
    if (change < 1e-2)
      scaling = false;
    if (change <= 4e-16)
      break;
  }
  RKMMath3x3Matrix check = q.Transpose() * q;
  for (int i = 0; i < 3; ++i)
    for (int j = 0; j < 3; ++j)
      if (!(std::fabs(check.m[i][j] - (i == j ? 1.0 : 0.0)) <= 1e-12))
        return 0;
  out = q;
  return 1;
}
