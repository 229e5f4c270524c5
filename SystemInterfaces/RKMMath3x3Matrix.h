#pragma once

#include "RKMExport.h"
#include "RKMMathVector.h"
#include "RKMSysTypes.h"

/// 3×3 matrix of doubles, row-major; identity when default-built.
class RKM_EXPORT RKMMath3x3Matrix
{
public:
  RKMMath3x3Matrix();
  RKMMath3x3Matrix(double a00, double a01, double a02,
                   double a10, double a11, double a12,
                   double a20, double a21, double a22);
  /// The matrix whose columns are c0, c1, c2.
  static RKMMath3x3Matrix FromColumns(const RKMMathVector &c0, const RKMMathVector &c1, const RKMMathVector &c2);

  double &operator()(int row, int col) { return m[row][col]; }
  double operator()(int row, int col) const { return m[row][col]; }
  RKMMathVector GetRow(int row) const { return {m[row][0], m[row][1], m[row][2]}; }
  RKMMathVector GetColumn(int col) const { return {m[0][col], m[1][col], m[2][col]}; }

  RKMMathVector operator*(const RKMMathVector &v) const
  {
    return {m[0][0] * v.x + m[0][1] * v.y + m[0][2] * v.z, m[1][0] * v.x + m[1][1] * v.y + m[1][2] * v.z,
            m[2][0] * v.x + m[2][1] * v.y + m[2][2] * v.z};
  }
  RKMMath3x3Matrix operator*(const RKMMath3x3Matrix &b) const;
  bool operator==(const RKMMath3x3Matrix &b) const;
  bool operator!=(const RKMMath3x3Matrix &b) const { return !(*this == b); }

  RKMMath3x3Matrix Transpose() const;
  double Determinant() const;
  /// E_FAIL with out untouched when the matrix is singular relative to its rows' lengths, or not finite.
  HRESULT Inverse(RKMMath3x3Matrix &out) const;
  unsigned char IsIdentity() const;
  /// True when the matrix is s·I (to a relative 1e-12), s ≠ 0; gives s where asked.
  unsigned char IsScaling(double *scale = nullptr) const;
  /// True when the matrix is s·R with R a proper rotation (to a relative 1e-9); s is negative for a
  /// reflection. Gives s where asked.
  unsigned char IsSimilitude(double &scale) const;
  /// The orthogonal matrix nearest to this one (polar factor, keeping a reflection a reflection).
  /// Returns 1 with out set, or 0 with out untouched when the matrix is singular or not finite.
  int MakeIsometry(RKMMath3x3Matrix &out) const;

private:
  double m[3][3];
};
