#pragma once

#include "RKMExport.h"
#include "RKMThreads.h"

/// A thread with no name, argument or flags; give it a function with SetFunction and start it with Run.
/// The destructor waits for a running thread.
class RKM_EXPORT RKMPolyThreads : public RKMThreads
{
public:
  RKMPolyThreads() : RKMThreads(nullptr, nullptr, -1, 0, 0) {}
  ~RKMPolyThreads() override;
};
