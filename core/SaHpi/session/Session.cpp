// The session table: a fixed array of slots guarded by one semaphore. Ids are
// handed out in increasing order and never reused, so a client holding a
// stale id can never reach somebody else's session; a new session takes the
// lowest free slot, so a slot's index says nothing about the id in it.
#include "core/SaHpi/session/Session.h"

#include <atomic>
#include <cstdio>
#include <cstdlib>

#include "core/SaHpi/events/EventManager.h"
#include "core/utils/KviTrace.h"

namespace
{

// Wait for the table's semaphore, in the semaphore's unit (milliseconds).
constexpr SaHpiUint32T SESSION_SEM_TIMEOUT = 500;
// nextSession never takes this value: the daemon stops rather than wrap.
constexpr SaHpiUint32T SESSION_ID_LIMIT = 0xFFFFFFFFu;

KviSessionIdsT KviCsSessionList[KVI_CS_MAX_SESSIONS];
KviCsSemaphore KviCsSessionSemaphore;
SaHpiUint32T nextSession = KVI_CS_SESSION_OFFSET;

std::atomic<KviCsSessionSignalFnT> signalEventThreads{kviCsSignalEventThreads};

// Index of the open slot that holds SessionId, -1 if none. Every slot is
// looked at and the last match wins; ids are unique, so this only matters if
// the table were ever inconsistent. Caller holds the semaphore.
int findSession(SaHpiSessionIdT SessionId) noexcept
{
    int index = -1;
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++) {
        if (KviCsSessionList[i].SessionId == SessionId && KviCsSessionList[i].InUse == SAHPI_TRUE)
            index = i;
    }
    return index;
}

SaErrorT signalReaders() noexcept
{
    return signalEventThreads.load(std::memory_order_acquire)();
}

// Ids are printed with %d, as they always have been in this log.
SaHpiInt32T asLogged(SaHpiUint32T Value) noexcept
{
    return static_cast<SaHpiInt32T>(Value);
}

// What every kind of close does to a slot; the id may stay, since a slot
// without InUse never matches a lookup.
void freeSlot(KviSessionIdsT &slot) noexcept
{
    slot.InUse = SAHPI_FALSE;
    slot.DomainId = 0;
    slot.ConnDesc = 0;
}

// After sessions closed, wakes blocked event readers if any of those sessions
// was subscribed. The caller has released the table by now, so woken readers
// can look their session up at once. A failure is logged in the caller's name
// with the caller's wording for what failed.
SaErrorT wakeReadersAfterClose(bool anySubscribed, const char *failedCall,
                               const char *caller) noexcept
{
    if (!anySubscribed)
        return SA_OK;
    SaErrorT rc = signalReaders();
    if (rc == SA_OK)
        return SA_OK;
    kviCsLogger(__FILE__, __LINE__, caller, KVI_LOG_WARN_NUM, "%s failed.  rc=%d", failedCall, rc);
    return SA_ERR_HPI_ERROR;
}

} // namespace

// Refuses an id below the offset, which was never handed out, without taking
// the table's semaphore.
#define KVI_SESSION_ID_CHECK(SessionId)                                                            \
    do {                                                                                           \
        if ((SessionId) < KVI_CS_SESSION_OFFSET) {                                                 \
            KVI_DLOG(KVI_LOG_DBG_H, "Invalid session %d passed in. ", asLogged(SessionId));        \
            return SA_ERR_HPI_INVALID_SESSION;                                                     \
        }                                                                                          \
    } while (0)

// Takes the table's semaphore into `guard` for the rest of the scope; a failed
// wait is logged at LEVEL and leaves the table untouched.
#define KVI_SESSION_TABLE_LOCK(guard, LEVEL)                                                       \
    KVI_SEM_GUARD(guard, &KviCsSessionSemaphore, SESSION_SEM_TIMEOUT);                             \
    if (!guard.held()) {                                                                           \
        KVI_ELOG(LEVEL, "kviCsSemWait failed.  rc=%d", guard.result());                            \
        return SA_ERR_HPI_ERROR;                                                                   \
    }

// Finds the open slot of SessionId into `slot`, or ends the call with
// SA_ERR_HPI_INVALID_SESSION. The lookup matches open slots only; the InUse
// test keeps a closed slot refused (with CLOSED_TEXT at LEVEL) should that
// rule ever change.
#define KVI_SESSION_OPEN_SLOT(slot, LEVEL, CLOSED_TEXT)                                            \
    const int slot##Index = findSession(SessionId);                                                \
    if (slot##Index < 0) {                                                                         \
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Session");                                         \
        return SA_ERR_HPI_INVALID_SESSION;                                                         \
    }                                                                                              \
    KviSessionIdsT &slot = KviCsSessionList[slot##Index];                                          \
    if (slot.InUse != SAHPI_TRUE) {                                                                \
        KVI_DLOG(LEVEL, CLOSED_TEXT);                                                              \
        return SA_ERR_HPI_INVALID_SESSION;                                                         \
    }

extern "C" {

SaErrorT kviCsSessionInitialize(void) noexcept
{
    KVI_TRACE("Slots: %d", KVI_CS_MAX_SESSIONS);
    if (KVI_CS_SEM_INIT(&KviCsSessionSemaphore, 1) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Can't initialize session semaphore!");
        exit(1);
    }
    // LastEventRead and nextSession survive: ids already given out stay spent.
    for (KviSessionIdsT &slot : KviCsSessionList) {
        freeSlot(slot);
        slot.EventSubscribed = SAHPI_FALSE;
        slot.SessionId = 0;
    }
    return SA_OK;
}

SaErrorT kviCsSessionOpen(SaHpiDomainIdT DomainId, SaHpiSessionIdT *SessionId) noexcept
{
    char exitText[32] = "";
    KVI_TRACE("DomainId: %u", DomainId);
    KVI_NULL_CHECK(SessionId);
    if (DomainId != SAHPI_DEFAULT_DOMAIN_ID) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid domain: %d", asLogged(DomainId));
        return SA_ERR_HPI_INVALID_DOMAIN;
    }
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_ERR_NONFATAL);
    if (nextSession == SESSION_ID_LIMIT) {
        // Wrapping would hand out ids that clients may still hold; the
        // semaphore stays taken, nobody gets in before the process ends.
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Session Limit Reached, fatal error");
        exit(1);
    }
    for (KviSessionIdsT &slot : KviCsSessionList) {
        if (slot.InUse)
            continue;
        // ConnDesc and LastEventRead keep what the slot held.
        slot.InUse = SAHPI_TRUE;
        slot.DomainId = SAHPI_DEFAULT_DOMAIN_ID;
        slot.EventSubscribed = SAHPI_FALSE;
        slot.SessionId = nextSession;
        *SessionId = nextSession;
        nextSession++;
        table.release();
        snprintf(exitText, sizeof exitText, "Session(%d)", asLogged(*SessionId));
        trace.exitMessage(exitText);
        return SA_OK;
    }
    table.release();
    KVI_WLOG(KVI_LOG_WARN, "Out of space-- can't open another session.");
    return SA_ERR_HPI_DATA_EX_LIMITS;
}

SaErrorT kviCsSessionValidate(SaHpiSessionIdT SessionId) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_SESSION_ID_CHECK(SessionId);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_ERR_NONFATAL);
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++) {
        const KviSessionIdsT &slot = KviCsSessionList[i];
        KVI_DLOG(KVI_LOG_DBG_L, "Session %d: %d, Domain %d, ConnDesc %d", i + KVI_CS_SESSION_OFFSET,
                 slot.InUse, asLogged(slot.DomainId), slot.ConnDesc);
        if (slot.SessionId == SessionId && slot.InUse == SAHPI_TRUE) {
            trace.exitMessage("Valid session");
            return SA_OK;
        }
    }
    trace.exitMessage("Invalid session");
    return SA_ERR_HPI_INVALID_SESSION;
}

SaErrorT kviCsSessionClose(SaHpiSessionIdT SessionId) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_SESSION_ID_CHECK(SessionId);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_ERR_NONFATAL);
    const int index = findSession(SessionId);
    if (index < 0) {
        // Unknown and already closed ids look the same here; both are
        // answered as a repeated close.
        KVI_DLOG(KVI_LOG_DBG_H, "Can't close a closed session!");
        return SA_ERR_HPI_DUPLICATE;
    }
    KviSessionIdsT &slot = KviCsSessionList[index];
    // EventSubscribed and LastEventRead stay; the next open clears the flag.
    const bool wasSubscribed = slot.EventSubscribed == SAHPI_TRUE;
    freeSlot(slot);
    slot.SessionId = 0;
    table.release();
    return wakeReadersAfterClose(wasSubscribed, "kviCsSignalEventThreads", __func__);
}

SaErrorT kviCsGetDomainFromSession(SaHpiSessionIdT SessionId, SaHpiDomainIdT *Domain) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_NULL_CHECK(Domain);
    if (kviCsSessionValidate(SessionId) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSessionValidate failed. sess=%u", SessionId);
        return SA_ERR_HPI_INVALID_SESSION;
    }
    // Only the default domain exists, so the slot need not be read.
    *Domain = SAHPI_DEFAULT_DOMAIN_ID;
    return SA_OK;
}

SaErrorT kviCsAddConnectionToSession(SaHpiSessionIdT SessionId, SaHpiInt32T ConnDesc) noexcept
{
    KVI_TRACE("SessionId: %u, ConnDesc: %d", SessionId, ConnDesc);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    const int index = findSession(SessionId);
    // An unknown id leaves the index at -1, which must not reach the table.
    if (index < 0 || KviCsSessionList[index].InUse != SAHPI_TRUE) {
        KVI_WLOG(KVI_LOG_WARN, "Can't add connection to a closed session! SessionId(%d) index(%d)",
                 asLogged(SessionId), index);
        return SA_ERR_HPI_INVALID_SESSION;
    }
    KviCsSessionList[index].ConnDesc = ConnDesc;
    return SA_OK;
}

SaErrorT kviCsGetConnectionFromSession(SaHpiSessionIdT SessionId, SaHpiInt32T *ConnDesc) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_NULL_CHECK(ConnDesc);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    KVI_SESSION_OPEN_SLOT(slot, KVI_LOG_WARN, "Can't get connection of a closed session!");
    *ConnDesc = slot.ConnDesc;
    return SA_OK;
}

SaErrorT kviCsCloseAllSessionsToConnection(SaHpiInt32T ConnDesc) noexcept
{
    KVI_TRACE("ConnDesc: %d", ConnDesc);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    bool anySubscribed = false;
    for (KviSessionIdsT &slot : KviCsSessionList) {
        if (slot.InUse != SAHPI_TRUE || slot.ConnDesc != ConnDesc)
            continue;
        freeSlot(slot);
        anySubscribed = anySubscribed || slot.EventSubscribed == SAHPI_TRUE;
    }
    table.release();
    // The signal's failure is reported as a failed wait here, as it always was.
    return wakeReadersAfterClose(anySubscribed, "kviCsSemWait", __func__);
}

SaErrorT kviCsCloseAllSessions(void) noexcept
{
    KVI_TRACE("Slots: %d", KVI_CS_MAX_SESSIONS);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    bool anySubscribed = false;
    for (KviSessionIdsT &slot : KviCsSessionList) {
        if (slot.InUse != SAHPI_TRUE)
            continue;
        slot.InUse = SAHPI_FALSE;
        anySubscribed = anySubscribed || slot.EventSubscribed == SAHPI_TRUE;
    }
    table.release();
    // The signal's failure is reported as a failed wait here, as it always was.
    return wakeReadersAfterClose(anySubscribed, "kviCsSemWait", __func__);
}

SaErrorT kviCsSetSessionLastEvent(SaHpiSessionIdT SessionId, SaHpiUint32T LastEventRead) noexcept
{
    KVI_TRACE("SessionId: %u, LastEventRead: %u", SessionId, LastEventRead);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    KVI_SESSION_OPEN_SLOT(slot, KVI_LOG_DBG_H, "Can't set the TimeStamp on a closed session!");
    if (slot.EventSubscribed != SAHPI_TRUE) {
        KVI_DLOG(KVI_LOG_DBG_H, "Can't set the TimeStamp without a subscription!");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    slot.LastEventRead = LastEventRead;
    return SA_OK;
}

SaErrorT kviCsGetSessionLastEvent(SaHpiSessionIdT SessionId, SaHpiUint32T *LastEventRead) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_NULL_CHECK(LastEventRead);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    KVI_SESSION_OPEN_SLOT(slot, KVI_LOG_DBG_H, "Can't get the TimeStamp from a closed session!");
    if (slot.EventSubscribed != SAHPI_TRUE) {
        KVI_DLOG(KVI_LOG_DBG_H, "Can't get the TimeStamp without a subscription!");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    *LastEventRead = slot.LastEventRead;
    return SA_OK;
}

SaErrorT kviCsSetSessionEventSubscription(SaHpiSessionIdT SessionId, SaHpiBoolT EventSubscribe,
                                          SaHpiUint32T LastEventRead) noexcept
{
    KVI_TRACE("SessionId: %u, EventSubscribe: %d, LastEventRead: %u", SessionId, EventSubscribe,
              LastEventRead);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    KVI_SESSION_OPEN_SLOT(slot, KVI_LOG_DBG_H, "Can't set subscription state on a closed session!");
    // Any non-zero request subscribes, so the stored flag is always a
    // proper boolean and the comparison below means what it says.
    const SaHpiBoolT requested = EventSubscribe ? SAHPI_TRUE : SAHPI_FALSE;
    if (requested == slot.EventSubscribed) {
        if (requested == SAHPI_TRUE) {
            KVI_DLOG(KVI_LOG_DBG_H, "This Session has already subscribed for events!");
            return SA_ERR_HPI_DUPLICATE;
        }
        KVI_DLOG(KVI_LOG_DBG_H, "This Session is not currently subscribed for events!");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    slot.EventSubscribed = requested;
    slot.LastEventRead = LastEventRead;
    return SA_OK;
}

SaErrorT kviCsGetSessionEventSubscription(SaHpiSessionIdT SessionId,
                                          SaHpiBoolT *EventSubscribe) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_NULL_CHECK(EventSubscribe);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    KVI_SESSION_OPEN_SLOT(slot, KVI_LOG_DBG_H,
                          "Can't get the subscription state of a closed session!");
    *EventSubscribe = slot.EventSubscribed;
    return SA_OK;
}

} // extern "C"

KviCsSessionSignalFnT kviCsSessionSetSignalHook(KviCsSessionSignalFnT Hook) noexcept
{
    return signalEventThreads.exchange(Hook != nullptr ? Hook : kviCsSignalEventThreads,
                                       std::memory_order_acq_rel);
}

SaErrorT kviCsSessionSetNextId(SaHpiUint32T NextId) noexcept
{
    KVI_TRACE("NextId: %u", NextId);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    nextSession = NextId;
    return SA_OK;
}

SaErrorT kviCsSessionTableCopy(KviSessionIdsT *Copy) noexcept
{
    KVI_TRACE("Slots: %d", KVI_CS_MAX_SESSIONS);
    KVI_NULL_CHECK(Copy);
    KVI_SESSION_TABLE_LOCK(table, KVI_LOG_WARN);
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++)
        Copy[i] = KviCsSessionList[i];
    return SA_OK;
}

KviCsSemaphore *kviCsSessionSemaphore() noexcept
{
    return &KviCsSessionSemaphore;
}
