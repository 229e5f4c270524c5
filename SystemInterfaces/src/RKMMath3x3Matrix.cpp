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

RKMMathVector RKMMath3x3Matrix::operator*(const RKMMathVector &v) const
{
  return {m[0][0] * v.x + m[0][1] * v.y + m[0][2] * v.z,
          m[1][0] * v.x + m[1][1] * v.y + m[1][2] * v.z,
          m[2][0] * v.x + m[2][1] * v.y + m[2][2] * v.z};
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

HRESULT RKMMath3x3Matrix::Inverse(RKMMath3x3Matrix &out) const
{
  RKMMathVector r0 = GetRow(0), r1 = GetRow(1), r2 = GetRow(2);
  RKMMathVector c0 = r1 ^ r2, c1 = r2 ^ r0, c2 = r0 ^ r1;
  double det = r0 * c0;
  // Hadamard: |det| ≤ |r0|·|r1|·|r2|. A determinant this small relative to that bound is lost in
  // rounding, and the inverse would be noise.
  double bound = r0.Norm() * r1.Norm() * r2.Norm();
  if (!std::isfinite(det) || !std::isfinite(bound) || !(std::fabs(det) > 1e-14 * bound))
    return E_FAIL;
  RKMMath3x3Matrix inv = FromColumns(c0 / det, c1 / det, c2 / det);
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
  double det = Determinant();
  if (!std::isfinite(det) || det == 0.0)
    return 0;
  double s = std::cbrt(det);
  double s2 = s * s;
  // MᵀM must be s²·I: columns orthogonal and all of squared length s².
  RKMMathVector c[3] = {GetColumn(0), GetColumn(1), GetColumn(2)};
  double tol = 1e-9 * s2;
  for (int i = 0; i < 3; ++i)
    for (int j = i; j < 3; ++j)
    {
      double expected = (i == j) ? s2 : 0.0;
      if (!(std::fabs(c[i] * c[j] - expected) <= tol))
        return 0;
    }
  scale = s;
  return 1;
}

int RKMMath3x3Matrix::MakeIsometry(RKMMath3x3Matrix &out) const
{
  // Newton's iteration for the polar factor, Q ← (Q + Q⁻ᵀ)/2, converges quadratically to the
  // orthogonal matrix nearest to M and keeps the sign of the determinant.
  RKMMath3x3Matrix q = *this;
  for (int iter = 0; iter < 100; ++iter)
  {
    RKMMath3x3Matrix inv;
    if (FAILED(q.Inverse(inv)))
      return 0;
    RKMMath3x3Matrix invT = inv.Transpose();
    RKMMath3x3Matrix next;
    double change = 0.0;
    for (int i = 0; i < 3; ++i)
      for (int j = 0; j < 3; ++j)
      {
        next.m[i][j] = 0.5 * (q.m[i][j] + invT.m[i][j]);
        change = std::fmax(change, std::fabs(next.m[i][j] - q.m[i][j]));
      }
    q = next;
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
