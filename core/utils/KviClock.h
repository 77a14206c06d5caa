// The one place the library reads a clock. Wall-clock readings (HPI time, log
// stamps) use CLOCK_REALTIME, lock deadlines CLOCK_MONOTONIC, so a deadline
// does not move when the wall clock is set, and the deadline's range guard
// counts seconds since boot rather than since 1970, which would trip late in
// 2037. A test swaps the reader to move a clock (past January 2038, say)
// without touching the machine's.
#pragma once

#include <time.h>

using KviClockReaderT = int (*)(clockid_t Clock, struct timespec *Now);
extern KviClockReaderT kviCsClockRead;
