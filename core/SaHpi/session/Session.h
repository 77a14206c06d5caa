// Session table internals shared with the event queue and the tests; nothing
// here is exported from the shared library.
#pragma once

#include "kvi/KviSemaphore.h"
#include "kvi/KviSession.h"

// Wakes every reader blocked in an event get; each re-checks its session and
// leaves if the session is gone. Called after a subscribed session closes,
// never while the table's semaphore is held.
using KviCsSessionSignalFnT = SaErrorT (*)(void);

// Closing a subscribed session calls kviCsSignalEventThreads of the event
// queue. Tests put a hook of their own in its place to see the call; the
// previous hook is returned, and nullptr puts kviCsSignalEventThreads back.
KviCsSessionSignalFnT kviCsSessionSetSignalHook(KviCsSessionSignalFnT Hook) noexcept;

// Test seams.
// Sets the next session id to hand out, so a test can reach the end of the
// id space without four billion opens.
SaErrorT kviCsSessionSetNextId(SaHpiUint32T NextId) noexcept;
// Copies all KVI_CS_MAX_SESSIONS slots (taken under the table's semaphore).
SaErrorT kviCsSessionTableCopy(KviSessionIdsT *Copy) noexcept;
// The table's semaphore, so a test can hold it and make waits time out.
KviCsSemaphore *kviCsSessionSemaphore() noexcept;
