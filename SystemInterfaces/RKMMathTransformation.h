#pragma once

#include "RKMExport.h"
#include "RKMMath3x3Matrix.h"
#include "RKMMathPoint.h"
#include "RKMSysTypes.h"

/// Affine map p → M·p + t; identity when default-built.
class RKM_EXPORT RKMMathTransformation
{
public:
  RKMMathTransformation() = default;
  RKMMathTransformation(const RKMMath3x3Matrix &matrix, const RKMMathVector &translation);
  /// The translation by t.
  explicit RKMMathTransformation(const RKMMathVector &translation);

  RKMMathPoint operator*(const RKMMathPoint &p) const { return RKMMathPoint(m_matrix * p.AsVector() + m_translation); }
  /// Vectors are mapped by the matrix only.
  RKMMathVector operator*(const RKMMathVector &v) const { return m_matrix * v; }
  /// Composition: (this * b) applies b first.
  RKMMathTransformation operator*(const RKMMathTransformation &b) const;
  bool operator==(const RKMMathTransformation &b) const;
  bool operator!=(const RKMMathTransformation &b) const { return !(*this == b); }

  void GetMatrix(RKMMath3x3Matrix &matrix) const { matrix = m_matrix; }
  const RKMMath3x3Matrix &GetMatrix() const { return m_matrix; }
  void SetMatrix(const RKMMath3x3Matrix &matrix) { m_matrix = matrix; }
  const RKMMathVector &GetTranslation() const { return m_translation; }
  void SetTranslation(const RKMMathVector &translation) { m_translation = translation; }

  /// Inverts in place. E_FAIL, and the transformation unchanged, when the matrix is singular.
  HRESULT ComputeInverse();
  /// Exactly the identity.
  unsigned char IsIdentity() const;
  /// True when the matrix is a similitude s·R; gives s (negative for a reflection).
  unsigned char IsSimilitude(double &scale) const { return m_matrix.IsSimilitude(scale); }

private:
  RKMMath3x3Matrix m_matrix;
  RKMMathVector m_translation;
};
