#pragma once

// Interlocked operations on plain int words, sequentially consistent (full barriers). They act on an
// int the way std::atomic_ref<int> would, so words that other code also reads and writes as plain
// ints (reference counts, flag words) stay ints.

/// Atomic ++*p; gives the new value.
inline int RKMInterlockedIncrement(int *p) { return __atomic_add_fetch(p, 1, __ATOMIC_SEQ_CST); }
/// Atomic --*p; gives the new value.
inline int RKMInterlockedDecrement(int *p) { return __atomic_sub_fetch(p, 1, __ATOMIC_SEQ_CST); }
/// Stores exchange when *p equals comparand; gives the value *p had before.
inline int RKMInterlockedCompareExchange(int *p, int exchange, int comparand)
{
  __atomic_compare_exchange_n(p, &comparand, exchange, false, __ATOMIC_SEQ_CST, __ATOMIC_SEQ_CST);
  return comparand;
}
/// An atomic read of *p.
inline int RKMInterlockedRead(const int *p) { return __atomic_load_n(p, __ATOMIC_SEQ_CST); }
