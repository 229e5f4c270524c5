#include "RKMMapOfIntIntToFloat.h"

#include <new>

RKMMapOfIntIntToFloat::RKMMapOfIntIntToFloat(int size) : m_columns(size) {}

RKMMapOfIntIntToFloat::RKMMapOfIntIntToFloat(const RKMMapOfIntIntToFloat &other) : m_columns(other.m_columns.Size())
{
  CopyFrom(other);
}

RKMMapOfIntIntToFloat &RKMMapOfIntIntToFloat::operator=(const RKMMapOfIntIntToFloat &other)
{
  if (this != &other)
  {
    RemoveAll();
    m_valid = true;
    CopyFrom(other);
  }
  return *this;
}

RKMMapOfIntIntToFloat::~RKMMapOfIntIntToFloat() { RemoveAll(); }

void RKMMapOfIntIntToFloat::CopyFrom(const RKMMapOfIntIntToFloat &other)
{
  for (Columns::Iterator c(other.m_columns); !c.End(); ++c)
    for (RKMMapOfIntToFloat::Iterator r(*c.GetData()); !r.End(); ++r)
      if (FAILED(Insert(r.GetKey(), c.GetKey(), r.GetData())))
      {
        RemoveAll();
        m_valid = false;
        return;
      }
}

HRESULT RKMMapOfIntIntToFloat::Store(int i, int j, float value, bool update)
{
  RKMMapOfIntToFloat *column = nullptr;
  bool created = false;
  if (!m_columns.Locate(j, column))
  {
    column = new (std::nothrow) RKMMapOfIntToFloat;
    if (!column)
      return E_OUTOFMEMORY;
    const HRESULT hr = m_columns.Insert(j, column);
    if (FAILED(hr))
    {
      delete column;
      return hr;
    }
    created = true;
  }
  const HRESULT hr = update ? column->InsertOrUpdate(i, value) : column->Insert(i, value);
  if (FAILED(hr) && created)
  {
    m_columns.Remove(j);
    delete column;
  }
  return hr;
}

HRESULT RKMMapOfIntIntToFloat::Insert(int i, int j, float value)
{
  float old;
  const bool present = Locate(i, j, old);
  const HRESULT hr = Store(i, j, value, false);
  if (hr == S_OK && !present)
    ++m_size;
  return hr;
}

HRESULT RKMMapOfIntIntToFloat::InsertOrUpdate(int i, int j, float value)
{
  float old;
  const bool present = Locate(i, j, old);
  const HRESULT hr = Store(i, j, value, true);
  if (hr == S_OK && !present)
    ++m_size;
  return hr;
}

unsigned char RKMMapOfIntIntToFloat::Locate(int i, int j, float &value) const
{
  RKMMapOfIntToFloat *column = nullptr;
  return m_columns.Locate(j, column) && column->Locate(i, value);
}

HRESULT RKMMapOfIntIntToFloat::Remove(int i, int j)
{
  RKMMapOfIntToFloat *column = nullptr;
  if (!m_columns.Locate(j, column) || column->Remove(i) != S_OK)
    return S_FALSE;
  --m_size;
  if (column->Size() == 0)
  {
    m_columns.Remove(j);
    delete column;
  }
  return S_OK;
}

void RKMMapOfIntIntToFloat::RemoveAll()
{
  for (Columns::Iterator c(m_columns); !c.End(); ++c)
    delete c.GetData();
  m_columns.RemoveAll();
  m_size = 0;
}

const RKMMapOfIntToFloat *RKMMapOfIntIntToFloat::GetColumn(int j) const
{
  RKMMapOfIntToFloat *column = nullptr;
  return m_columns.Locate(j, column) ? column : nullptr;
}
