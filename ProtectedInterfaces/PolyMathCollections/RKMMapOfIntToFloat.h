#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <map>

/// Ordered map of ints to floats (a balanced tree); iteration runs by increasing key.
class RKM_EXPORT RKMMapOfIntToFloat
{
public:
  /// S_OK when added; S_FALSE when the key maps to this value already, E_FAIL when it maps to another
  /// (kept); E_OUTOFMEMORY.
  HRESULT Insert(int key, float value);
  /// S_FALSE when the key maps to this value already; otherwise stores it and gives S_OK; E_OUTOFMEMORY.
  HRESULT InsertOrUpdate(int key, float value);
  /// S_OK when the key was present and its value replaced, S_FALSE when absent.
  HRESULT Update(int key, float value);
  /// True and the value when the key is present; value untouched otherwise.
  unsigned char Locate(int key, float &value) const;
  /// S_OK when removed, S_FALSE when absent.
  HRESULT Remove(int key);
  void RemoveAll() { m_map.clear(); }
  int Size() const { return static_cast<int>(m_map.size()); }

  /// Walks the entries by increasing key, as they stand; the map must not change meanwhile.
  class Iterator
  {
  public:
    explicit Iterator(const RKMMapOfIntToFloat &m) : m_it(m.m_map.begin()), m_end(m.m_map.end()) {}
    unsigned char End() const { return m_it == m_end; }
    Iterator &operator++()
    {
      ++m_it;
      return *this;
    }
    int GetKey() const { return m_it->first; }
    float GetData() const { return m_it->second; }

  private:
    std::map<int, float>::const_iterator m_it, m_end;
  };

private:
  std::map<int, float> m_map;
};
