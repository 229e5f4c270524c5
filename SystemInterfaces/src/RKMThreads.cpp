#include "RKMThreads.h"

#include <chrono>
#include <functional>
#include <new>

#include <pthread.h>

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
