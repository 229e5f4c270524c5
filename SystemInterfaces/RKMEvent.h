#pragma once

#include "RKMExport.h"
#include "RKMSysTypes.h"

#include <condition_variable>
#include <mutex>

/// A settable event: Wait blocks until it is set. An auto-reset event lets one waiter through per
/// Set and resets itself; a manual-reset event stays set until Reset.
class RKM_EXPORT RKMEvent
{
public:
  explicit RKMEvent(int manualReset);
  RKMEvent(const RKMEvent &) = delete;
  RKMEvent &operator=(const RKMEvent &) = delete;

  void Set();
  void Reset();
  /// Blocks until set; S_OK, or S_FALSE when the time (in milliseconds, negative for none) runs out.
  HRESULT Wait(int milliseconds = -1);

private:
  std::mutex m_mutex;
  std::condition_variable m_cv;
  bool m_manual;
  bool m_set = false;
};

/// A new event (manualReset 0: auto-reset), owned by the caller (delete it); null when memory runs out.
RKM_EXPORT RKMEvent *CreateRKMEvent(int manualReset);
