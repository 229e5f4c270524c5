#pragma once

#include <utility>

/// Holds one reference to a counted object (anything with AddRef and Release, such as an
/// RKMRefCounted) and releases it when it goes out of scope. Adopt takes over a reference the caller
/// already owns (a new object's first one, or one a member handed out); Share adds one of its own.
/// Copies add a reference, moves pass it on; an empty holder releases nothing.
template <class T>
class RKMRef
{
public:
  RKMRef() = default;
  ~RKMRef() { Reset(); }

  static RKMRef Adopt(T *object)
  {
    RKMRef ref;
    ref.m_object = object;
    return ref;
  }
  static RKMRef Share(T *object)
  {
    if (object)
      object->AddRef();
    return Adopt(object);
  }

  RKMRef(const RKMRef &other) : m_object(other.m_object)
  {
    if (m_object)
      m_object->AddRef();
  }
  RKMRef(RKMRef &&other) noexcept : m_object(other.m_object) { other.m_object = nullptr; }
  RKMRef &operator=(RKMRef other) noexcept
  {
    std::swap(m_object, other.m_object);
    return *this;
  }

  T *Get() const { return m_object; }
  T *operator->() const { return m_object; }
  T &operator*() const { return *m_object; }
  explicit operator bool() const { return m_object != nullptr; }

  /// Releases the held reference, if any, and holds nothing.
  void Reset()
  {
    T *object = m_object;
    m_object = nullptr;
    if (object)
      object->Release();
  }
  /// Gives the held reference to the caller, who must release it; the holder is left empty.
  T *Detach()
  {
    T *object = m_object;
    m_object = nullptr;
    return object;
  }

private:
  T *m_object = nullptr;
};
