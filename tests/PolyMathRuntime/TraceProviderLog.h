#pragma once

// What the test trace provider records, read back through TraceProviderTakeLog(out, capacity), which moves
// up to capacity of the oldest records into out and gives how many it moved.
extern "C"
{
  struct TraceProviderRecord
  {
    int fromObjectTrace; // 1: CreateObjectTraceEventFunction, 0: CreateStackTraceEventFunction
    int open;            // 1: an event was opened, 0: one was closed
    int type;
    long handle; // the number of the event opened or closed; -1: closed before, 0: a call outside the protocol
    char name[48];
  };

  typedef int (*TraceProviderTakeLogFn)(TraceProviderRecord *out, int capacity);
}
