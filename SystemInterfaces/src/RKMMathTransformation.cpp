#include "RKMMathTransformation.h"

RKMMathTransformation::RKMMathTransformation(const RKMMath3x3Matrix &matrix, const RKMMathVector &translation)
    : m_matrix(matrix), m_translation(translation)
{
}

RKMMathTransformation::RKMMathTransformation(const RKMMathVector &translation) : m_translation(translation) {}

RKMMathTransformation RKMMathTransformation::operator*(const RKMMathTransformation &b) const
{
  return RKMMathTransformation(m_matrix * b.m_matrix, m_matrix * b.m_translation + m_translation);
}

bool RKMMathTransformation::operator==(const RKMMathTransformation &b) const
{
  return m_matrix == b.m_matrix && m_translation == b.m_translation;
}

HRESULT RKMMathTransformation::ComputeInverse()
{
  RKMMath3x3Matrix inv;
  HRESULT hr = m_matrix.Inverse(inv);
  if (FAILED(hr))
    return hr;
  m_matrix = inv;
  m_translation = -(inv * m_translation);
  return S_OK;
}

unsigned char RKMMathTransformation::IsIdentity() const
{
  return m_matrix.IsIdentity() && m_translation == RKMMathVector();
}
