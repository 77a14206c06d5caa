// Session table internals shared with the event queue and the tests; nothing
// here is exported from the shared library.
#pragma once

#include "kvi/KviSemaphore.h"
#include "kvi/KviSession.h"

// Wakes every reader blocked in an event get; each re-checks its session and
// leaves if the session is gone. Called after a subscribed session closes,
// never while the table's semaphore is held.
using KviCsSessionSignalFnT = SaErrorT (*)(void);

// Until the event queue is built into the library the table starts with a
// hook that wakes nobody (no reader can be blocked yet). The event queue
// installs its kviCsSignalEventThreads here. Returns the hook that was
// installed before; nullptr puts the do-nothing hook back.
KviCsSessionSignalFnT kviCsSessionSetSignalHook(KviCsSessionSignalFnT Hook) noexcept;

// Test seams.
// Sets the next session id to hand out, so a test can reach the end of the
// id space without four billion opens.
SaErrorT kviCsSessionSetNextId(SaHpiUint32T NextId) noexcept;
// Copies all KVI_CS_MAX_SESSIONS slots (taken under the table's semaphore).
SaErrorT kviCsSessionTableCopy(KviSessionIdsT *Copy) noexcept;
// The table's semaphore, so a test can hold it and make waits time out.
KviCsSemaphore *kviCsSessionSemaphore() noexcept;
