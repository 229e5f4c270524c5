#include "RKMMapOfIntToFloat.h"

#include <cstring>

namespace
{
// "The same value" is the same bit pattern: a NaN stored twice is the same, −0 and +0 are not.
bool Same(float a, float b) { return std::memcmp(&a, &b, sizeof a) == 0; }
}

HRESULT RKMMapOfIntToFloat::Insert(int key, float value)
{
  try
  {
    auto result = m_map.emplace(key, value);
    if (result.second)
      return S_OK;
    return Same(result.first->second, value) ? S_FALSE : E_FAIL;
  }
  catch (...)
  {
    return E_OUTOFMEMORY;
  }
}

HRESULT RKMMapOfIntToFloat::InsertOrUpdate(int key, float value)
{
  try
  {
    auto result = m_map.emplace(key, value);
    if (result.second)
      return S_OK;
    if (Same(result.first->second, value))
      return S_FALSE;
    result.first->second = value;
    return S_OK;
  }
  catch (...)
  {
    return E_OUTOFMEMORY;
  }
}

HRESULT RKMMapOfIntToFloat::Update(int key, float value)
{
  auto it = m_map.find(key);
  if (it == m_map.end())
    return S_FALSE;
  it->second = value;
  return S_OK;
}

unsigned char RKMMapOfIntToFloat::Locate(int key, float &value) const
{
  auto it = m_map.find(key);
  if (it == m_map.end())
    return 0;
  value = it->second;
  return 1;
}

HRESULT RKMMapOfIntToFloat::Remove(int key) { return m_map.erase(key) ? S_OK : S_FALSE; }
