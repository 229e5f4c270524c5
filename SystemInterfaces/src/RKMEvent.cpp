#include "RKMEvent.h"

#include <chrono>
#include <new>

RKMEvent::RKMEvent(int manualReset) : m_manual(manualReset != 0) {}

void RKMEvent::Set()
{
  {
    std::lock_guard<std::mutex> lock(m_mutex);
    m_set = true;
  }
  if (m_manual)
    m_cv.notify_all();
  else
    m_cv.notify_one();
}

void RKMEvent::Reset()
{
  std::lock_guard<std::mutex> lock(m_mutex);
  m_set = false;
}

HRESULT RKMEvent::Wait(int milliseconds)
{
  std::unique_lock<std::mutex> lock(m_mutex);
  if (milliseconds < 0)
    m_cv.wait(lock, [this] { return m_set; });
  else if (!m_cv.wait_for(lock, std::chrono::milliseconds(milliseconds), [this] { return m_set; }))
    return S_FALSE;
  if (!m_manual)
    m_set = false;
  return S_OK;
}

RKMEvent *CreateRKMEvent(int manualReset) { return new (std::nothrow) RKMEvent(manualReset); }
