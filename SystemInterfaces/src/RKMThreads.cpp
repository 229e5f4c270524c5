#include "RKMEvent.h"
#include "RKMThreads.h"

#include <chrono>
#include <functional>
#include <new>

#include <pthread.h>

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

RKMThreads::RKMThreads(const char *, void *argument, int, int, int) : m_argument(argument) {}

RKMThreads::~RKMThreads() { Join(); }

void RKMThreads::Body(int count)
{
  m_threadId.store(static_cast<unsigned long>(pthread_self()));
  Begin();
  for (int i = 0; i < count; ++i)
    m_returnCode.store(m_function(m_argument));
  End();
  m_status.store(Finished);
}

HRESULT RKMThreads::Run(int count)
{
  if (!m_function || m_thread.joinable())
    return E_FAIL;
  m_status.store(Running);
  try
  {
    m_thread = std::thread(&RKMThreads::Body, this, count < 1 ? 1 : count);
  }
  catch (...)
  {
    m_status.store(FailedToStart);
    return E_FAIL;
  }
  return S_OK;
}

HRESULT RKMThreads::Join()
{
  if (!m_thread.joinable())
    return S_FALSE;
  if (m_thread.get_id() == std::this_thread::get_id())
    return E_FAIL;
  m_thread.join();
  return S_OK;
}

HRESULT RKMThreads::Kill() { return E_NOTIMPL; }
