// The event queue's interface inside the library: set-up and tear-down for
// saHpiInitialize and saHpiFinalize, subscription and retrieval for the API's
// event calls, and the wake-up the session table sends when a subscribed
// session closes. Only kviCsPutEvent (kvi/KviEvents.h) is exported.
#pragma once

#include <pthread.h>

#include <atomic>

#include "kvi/KviEvents.h"
#include "kvi/KviRwLock.h"

// One slot of the ring.
struct KviCsEventT {
    SaHpiEventT Event;
    SaHpiUint32T EventNumber; // 0: never written
    SaHpiBoolT ActiveAlarm;   // meant for ActiveAlarmSession alone
    SaHpiSessionIdT ActiveAlarmSession;
};

// The queue of the default domain. Writers hold EventQueueLock for writing;
// readers hold it for reading while they copy a slot and wait on
// EventQueueCond under EventQueueMutex without it. LastEventNumber and
// QueueShutdown are read in that wait, under the mutex rather than the lock,
// hence atomic.
struct KviCsDomainEventQueueT {
    KviCsRwLockT EventQueueLock;
    KviCsEventT *EventQueue; // QueueEntries slots; NULL once removed
    KviCsEventT *Current;    // the slot written last
    pthread_mutex_t EventQueueMutex;
    pthread_cond_t EventQueueCond;
    std::atomic<SaHpiUint32T> LastEventNumber;
    std::atomic<SaHpiBoolT> QueueShutdown;
};

extern "C" {
SaErrorT kviCsEventQueueInitialize(void) noexcept;
SaErrorT kviCsEventQueueFinalize(void) noexcept;
SaErrorT kviCsEventQueueCreate(SaHpiDomainIdT DomainId) noexcept;
SaErrorT kviCsEventQueueRemove(SaHpiDomainIdT DomainId) noexcept;

// The session's next event after the last one it read. Timeout is
// SAHPI_TIMEOUT_IMMEDIATE, SAHPI_TIMEOUT_BLOCK or nanoseconds. An event that
// follows a gap (the session fell a ring behind) is delivered with
// SA_ERR_HPI_DATA_TRUNCATED.
SaErrorT kviCsGetEvent(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout, SaHpiEventT *Event,
                       SaHpiUint32T *EventNumber) noexcept;

// Wakes every reader waiting in kviCsGetEvent; each re-checks its session.
SaErrorT kviCsSignalEventThreads(void) noexcept;

// Starts a subscription (*InitialEvent 0: from now on, answered with the
// number it starts after) or resumes one at *InitialEvent. The caller holds
// the plug-in master lock for reading when it asks for active alarms.
SaErrorT kviCsSubscribe(SaHpiSessionIdT SessionId, SaHpiBoolT ProvideActiveAlarms,
                        SaHpiUint32T *InitialEvent) noexcept;
SaErrorT kviCsUnsubscribe(SaHpiSessionIdT SessionId) noexcept;

// Puts the sensors in alarm as events for SessionId alone.
SaErrorT kviCsProcessActiveAlarms(SaHpiSessionIdT SessionId, SaHpiUint32T *InitialEvent) noexcept;
}

// Test seams.
// The number the next put continues from, so a test reaches the wrap of the
// 32-bit numbers without four billion puts. Taken under the write lock.
SaErrorT kviCsEventQueueSetLastEventNumber(SaHpiUint32T LastEventNumber) noexcept;
// The number of slots of the ring created last.
SaHpiInt32T kviCsEventQueueEntries() noexcept;
