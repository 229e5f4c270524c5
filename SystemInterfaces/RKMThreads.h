#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <atomic>
#include <thread>

/// The body of a thread: gets the thread's argument, gives its return code.
typedef int (*RKMThreadFunction)(void *argument);

/// A thread running a function. Run starts it; a thread that cannot start is reported by Run's result,
/// never thrown. The destructor joins a thread still running. Begin and End are hooks that a derived
/// class may override; they run on the thread around the function, so such a class joins in its own
/// destructor (the base's join would come after the derived part is gone).
class RKM_EXPORT RKMThreads
{
public:
  enum Status
  {
    NotStarted = 0,
    Running = 1,
    Finished = 2,
    FailedToStart = -1
  };

  /// The name is informational; the flags are accepted for compatibility.
  RKMThreads(const char *name, void *argument, int flag1, int flag2, int flag3);
  RKMThreads(const RKMThreads &) = delete;
  RKMThreads &operator=(const RKMThreads &) = delete;
  virtual ~RKMThreads();

  void SetFunction(RKMThreadFunction function) { m_function = function; }
  void SetArgument(void *argument) { m_argument = argument; }
  /// Starts the thread, which calls the function count times (at least once). E_FAIL when no function is
  /// set, a thread is already started and not joined, or the system cannot start one.
  HRESULT Run(int count = 1);
  /// Waits for the thread to finish. S_FALSE when no thread was started or it was joined already.
  HRESULT Join();
  /// Cannot be done safely to a running thread: E_NOTIMPL.
  HRESULT Kill();
  unsigned char IsRunning() const { return m_status.load() == Running; }
  Status GetStatus() const { return static_cast<Status>(m_status.load()); }
  /// The system identifier of the thread; 0 before it starts.
  unsigned long GetThreadId() const { return m_threadId.load(); }
  /// The last return code of the function; meaningful once the thread has finished.
  int GetThreadReturnCode() const { return m_returnCode.load(); }
  /// Traces go nowhere: the library prints nothing.
  void EmitTrace(const char *) const {}

protected:
  virtual void Begin() {}
  virtual void End() {}

private:
  void Body(int count);

  RKMThreadFunction m_function = nullptr;
  void *m_argument;
  std::thread m_thread;
  std::atomic<int> m_status{NotStarted};
  std::atomic<int> m_returnCode{0};
  std::atomic<unsigned long> m_threadId{0};
};
