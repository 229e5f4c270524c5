#pragma once

// What the test trace provider records. The trace tests read it through TraceProviderTakeLog, which
// moves up to capacity of the oldest records into out and gives how many it moved.
extern "C"
{
  struct TraceProviderRecord
  {
    int fromObjectTrace; // 1: CreateObjectTraceEventFunction, 0: CreateStackTraceEventFunction
    int open;            // 1: an event was opened, 0: one was closed
    int type;
    long handle;         // the number of the event opened or closed
    char name[48];
  };

  typedef int (*TraceProviderTakeLogFn)(TraceProviderRecord *out, int capacity);
}
