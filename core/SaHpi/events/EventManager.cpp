// The event queue of the default domain: one ring of fixed size shared by
// every session. Plug-ins put events and never wait for readers; the oldest
// slot is simply overwritten. Each subscribed session reads from its own
// position, which the session table keeps as its last event read, and learns
// of a gap through SA_ERR_HPI_DATA_TRUNCATED on the first event after it.
//
// Event numbers run from 2 (LastEventNumber starts at 1 and is incremented
// before use) and skip 0 when they wrap, since 0 marks a slot never written.
#include "core/SaHpi/events/EventManager.h"

#include <sys/time.h>

#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "core/SaHpi/session/Session.h"
#include "core/utils/KviTrace.h"
#include "kvi/KviConfig.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMemory.h"
#include "kvi/KviRdr.h"
#include "kvi/KviRpt.h"
#include "kvi/KviTime.h"

// The texts more than one operation writes.
#define KVI_EQ_SHUTDOWN_TEXT "Event queue is being shutdown. Somebody isn't being very nice!"
#define KVI_EQ_NO_RING_TEXT "Cannot put an event into a shutdown queue."

// Only the default domain has a queue.
#define KVI_EQ_DOMAIN_CHECK(DomainId)                                                              \
    do {                                                                                           \
        if ((DomainId) != SAHPI_DEFAULT_DOMAIN_ID) {                                               \
            KVI_ELOG(                                                                              \
                KVI_LOG_ERR_NONFATAL,                                                              \
                "Domain IDs other than SAHPI_DEFAULT_DOMAIN_ID are not yet supported. did=%u",     \
                (DomainId));                                                                       \
            return SA_ERR_HPI_INVALID_DOMAIN;                                                      \
        }                                                                                          \
    } while (0)

// Takes EventQueueLock into `guard` (a KviReadLock or KviWriteLock) for the
// rest of the scope and ends the call unless the ring is there.
#define KVI_EQ_LOCK_RING(GuardT, guard)                                                            \
    GuardT guard(&EventQueue.EventQueueLock, EVENT_QUEUE_LOCK_TIMEOUT,                             \
                 KVI_CALL_SITE("&EventQueue.EventQueueLock"));                                     \
    if (!guard.held()) {                                                                           \
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't get EventQueueLock.");                               \
        return SA_ERR_HPI_ERROR;                                                                   \
    }                                                                                              \
    if (EventQueue.EventQueue == nullptr || EventQueue.Current == nullptr) {                       \
        KVI_WLOG(KVI_LOG_WARN, KVI_EQ_NO_RING_TEXT);                                               \
        return SA_ERR_HPI_INVALID_REQUEST;                                                         \
    }

namespace
{

constexpr SaHpiInt32T DEFAULT_QUEUE_ENTRIES = 100;
// Waits for EventQueueLock, in the reader/writer lock's unit (milliseconds).
constexpr SaHpiUint32T EVENT_QUEUE_LOCK_TIMEOUT = 500;
// Wait for a plug-in's lock while reading its sensors for active alarms, as
// a redirected call waits.
constexpr SaHpiUint32T MAPL_LOCK_TIMEOUT = 1000;

KviCsDomainEventQueueT EventQueue{};
// Slots of the ring; the size the configuration asked for goes to the next
// creation, the ring keeps its own.
std::atomic<SaHpiInt32T> QueueEntries{DEFAULT_QUEUE_ENTRIES};
SaHpiInt32T RingEntries = 0; // guarded by EventQueueLock
// The lock, mutex and condition are set up by the first creation and kept for
// the life of the process: a reader may still be on its way out of a removed
// queue, and the session table may signal before any queue exists.
std::atomic<bool> PrimitivesReady{false};

const char *errorText(int Status, char *Buffer, size_t Size) noexcept
{
    // The GNU strerror_r, which _GNU_SOURCE selects, may return a static text.
    return strerror_r(Status, Buffer, Size);
}

// Holds EventQueueMutex. A failed lock is reported in the caller's name; a
// failed unlock leaves the queue unusable and ends the process.
class KviQueueMutexGuard
{
  public:
    explicit KviQueueMutexGuard(const KviCallSite &Site) noexcept : site_(Site)
    {
        status_ = pthread_mutex_lock(&EventQueue.EventQueueMutex);
        if (status_ != 0)
            report(KVI_LOG_ERR_NONFATAL_NUM,
                   "pthread_mutex_lock failed on EventQueueMutex. st=%d. err=%s", status_);
    }
    ~KviQueueMutexGuard() { release(); }
    KviQueueMutexGuard(const KviQueueMutexGuard &) = delete;
    KviQueueMutexGuard &operator=(const KviQueueMutexGuard &) = delete;

    bool held() const noexcept { return status_ == 0; }
    void release() noexcept
    {
        if (!held())
            return;
        status_ = EINVAL;
        const int st = pthread_mutex_unlock(&EventQueue.EventQueueMutex);
        if (st != 0) {
            report(KVI_LOG_ERR_FATAL_NUM,
                   "pthread_mutex_unlock failed on EventQueueMutex. st=%d. err=%s", st);
            exit(1);
        }
    }
    // Logs a failed pthread call with its status and text.
    void report(SaHpiUint32T Level, const char *Format, int Status) const noexcept
    {
        char buffer[128];
        kviCsLogger(site_.file, static_cast<SaHpiInt16T>(site_.line), site_.func, Level, Format,
                    Status, errorText(Status, buffer, sizeof buffer));
    }

  private:
    KviCallSite site_;
    int status_;
};

// Wakes every reader waiting on the condition.
SaErrorT broadcast(const KviCallSite &Site) noexcept
{
    KviQueueMutexGuard mutex(Site);
    if (!mutex.held())
        return SA_ERR_HPI_ERROR;
    pthread_cond_broadcast(&EventQueue.EventQueueCond);
    return SA_OK;
}

SaHpiUint32T successor(SaHpiUint32T Number) noexcept
{
    return Number == std::numeric_limits<SaHpiUint32T>::max() ? 1 : Number + 1;
}

KviCsEventT *nextSlot(KviCsEventT *Slot) noexcept
{
    return Slot == EventQueue.EventQueue + RingEntries - 1 ? EventQueue.EventQueue : Slot + 1;
}

KviCsEventT *previousSlot(KviCsEventT *Slot) noexcept
{
    return Slot == EventQueue.EventQueue ? EventQueue.EventQueue + RingEntries - 1 : Slot - 1;
}

// The size the configuration asks for; anything unusable falls back to the
// default with a line saying why.
SaHpiInt32T configuredEntries() noexcept
{
    char text[32] = "";
    if (kviCsCfgDataGet("KviEventQueueSize", sizeof text, text, nullptr) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "kviCsCfgDataGet returned failure on KviEventQueueSize key. Using default value "
                 "of %d.",
                 DEFAULT_QUEUE_ENTRIES);
        return DEFAULT_QUEUE_ENTRIES;
    }
    long long value = strtoll(text, nullptr, 10);
    if (value > INT32_MAX)
        value = INT32_MAX; // too large to allocate: creation says so
    if (value < 2) {
        KVI_WLOG(
            KVI_LOG_WARN,
            "KviEventQueueSize of %d is invalid. Value must be > 1. Using default value of %d.",
            static_cast<SaHpiInt32T>(value < INT32_MIN ? INT32_MIN : value), DEFAULT_QUEUE_ENTRIES);
        return DEFAULT_QUEUE_ENTRIES;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "Using KviEventQueueSize value of %d.",
             static_cast<SaHpiInt32T>(value));
    return static_cast<SaHpiInt32T>(value);
}

SaErrorT setUpPrimitives() noexcept
{
    if (PrimitivesReady.load(std::memory_order_acquire))
        return SA_OK;
    const SaErrorT rc = KVI_CS_RW_LOCK_INIT(&EventQueue.EventQueueLock);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_RW_LOCK_INIT failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    int st = pthread_mutex_init(&EventQueue.EventQueueMutex, nullptr);
    if (st != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "pthread_mutex_init failed. st=%d.", st);
        return SA_ERR_HPI_ERROR;
    }
    st = pthread_cond_init(&EventQueue.EventQueueCond, nullptr);
    if (st != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "pthread_cond_init failed. st=%d.", st);
        return SA_ERR_HPI_ERROR;
    }
    PrimitivesReady.store(true, std::memory_order_release);
    return SA_OK;
}

// Writes the events after Current, overwriting the oldest slots. Caller holds
// the write lock. Returns the number of the first.
SaHpiUint32T writeEvents(const SaHpiEventT *Events, SaHpiInt32T Count, SaHpiBoolT ActiveAlarm,
                         SaHpiSessionIdT Session) noexcept
{
    SaHpiUint32T first = 0;
    for (SaHpiInt32T i = 0; i < Count; i++) {
        KviCsEventT *slot = nextSlot(EventQueue.Current);
        EventQueue.Current = slot;
        slot->Event = Events[i];
        const SaHpiUint32T number = successor(EventQueue.LastEventNumber.load());
        EventQueue.LastEventNumber.store(number);
        slot->EventNumber = number;
        slot->ActiveAlarm = ActiveAlarm;
        if (ActiveAlarm == SAHPI_TRUE)
            slot->ActiveAlarmSession = Session;
        if (i == 0)
            first = number;
    }
    return first;
}

// The deadline of a wait of Timeout nanoseconds from now, on the clock the
// condition waits on.
SaErrorT deadlineAfter(SaHpiTimeoutT Timeout, struct timespec *Deadline) noexcept
{
    struct timeval now;
    if (gettimeofday(&now, nullptr) != 0) {
        const int err = errno;
        char buffer[128];
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "gettimeofday failed. st=%d. err=%s", -1,
                 errorText(err, buffer, sizeof buffer));
        return SA_ERR_HPI_ERROR;
    }
    const SaHpiTimeoutT wait = Timeout > 0 ? Timeout : 0;
    constexpr SaHpiInt64T NS = 1000000000;
    SaHpiInt64T nanoseconds = static_cast<SaHpiInt64T>(now.tv_usec) * 1000 + wait % NS;
    SaHpiInt64T seconds = static_cast<SaHpiInt64T>(now.tv_sec) + wait / NS + nanoseconds / NS;
    // A 32-bit time_t cannot hold every deadline a client may ask for.
    constexpr SaHpiInt64T maxSeconds = std::numeric_limits<time_t>::max();
    Deadline->tv_sec = static_cast<time_t>(seconds > maxSeconds ? maxSeconds : seconds);
    Deadline->tv_nsec = static_cast<long>(nanoseconds % NS);
    return SA_OK;
}

// Waits until there is an event after LastRead, as Timeout says, and tells
// why the wait ended when it is not that.
SaErrorT waitForEvent(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout,
                      const struct timespec &Deadline, SaHpiUint32T LastRead) noexcept
{
    KviQueueMutexGuard mutex(KVI_CALL_SITE("EventQueueMutex"));
    if (!mutex.held())
        return SA_ERR_HPI_ERROR;
    bool sessionValid = true;
    bool timedOut = false;
    while (LastRead == EventQueue.LastEventNumber.load() &&
           (sessionValid = kviCsSessionValidate(SessionId) == SA_OK) &&
           EventQueue.QueueShutdown.load() == SAHPI_FALSE) {
        if (Timeout == SAHPI_TIMEOUT_IMMEDIATE) {
            timedOut = true;
            break;
        }
        const bool block = Timeout == SAHPI_TIMEOUT_BLOCK;
        const int st =
            block ? pthread_cond_wait(&EventQueue.EventQueueCond, &EventQueue.EventQueueMutex)
                  : pthread_cond_timedwait(&EventQueue.EventQueueCond, &EventQueue.EventQueueMutex,
                                           &Deadline);
        if (st == 0 || st == EINTR)
            continue;
        if (st == ETIMEDOUT && !block) {
            timedOut = true;
            break;
        }
        mutex.report(KVI_LOG_ERR_FATAL_NUM,
                     block ? "Unexpected error from pthread_cond_wait. st=%d. err=%s"
                           : "Unexpected error from pthread_cond_timedwait. st=%d. err=%s",
                     st);
        return SA_ERR_HPI_ERROR;
    }
    mutex.release();
    if (timedOut) {
        KVI_DLOG(KVI_LOG_DBG_H, "pthread_cond_timedwait timed out waiting for event.");
        return SA_ERR_HPI_TIMEOUT;
    }
    if (EventQueue.QueueShutdown.load() == SAHPI_TRUE) {
        KVI_WLOG(KVI_LOG_WARN, KVI_EQ_SHUTDOWN_TEXT);
        return SA_ERR_HPI_ERROR;
    }
    if (!sessionValid) {
        KVI_DLOG(KVI_LOG_DBG_H, "Session is being closed. ");
        return SA_ERR_HPI_INVALID_SESSION;
    }
    if (LastRead == EventQueue.LastEventNumber.load()) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Woke up for an event but there aren't any.");
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

// The slot a session reads after LastRead: the one after LastRead if that is
// still in the ring, otherwise the oldest. Caller holds the lock.
const KviCsEventT *slotAfter(SaHpiUint32T LastRead) noexcept
{
    KviCsEventT *stop = EventQueue.Current;
    while (stop->EventNumber != LastRead && stop->EventNumber != 0) {
        stop = previousSlot(stop);
        if (stop == EventQueue.Current)
            break;
    }
    return nextSlot(stop);
}

// What the session finds after LastRead.
struct KviNextEventT {
    SaHpiUint32T Number;
    bool OthersAlarm; // an active alarm of another session: skipped
};

SaErrorT readAfter(SaHpiSessionIdT SessionId, SaHpiUint32T LastRead, SaHpiEventT *Event,
                   KviNextEventT *Next) noexcept
{
    KVI_EQ_LOCK_RING(KviReadLock, reader);
    const KviCsEventT *slot = slotAfter(LastRead);
    if (slot->EventNumber == 0) {
        // Only a position from before this queue was created gets here.
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Woke up for an event but there aren't any.");
        return SA_ERR_HPI_ERROR;
    }
    Next->Number = slot->EventNumber;
    Next->OthersAlarm = slot->ActiveAlarm == SAHPI_TRUE && slot->ActiveAlarmSession != SessionId;
    if (!Next->OthersAlarm)
        *Event = slot->Event;
    return SA_OK;
}

SaErrorT storeLastRead(SaHpiSessionIdT SessionId, SaHpiUint32T Number) noexcept
{
    const SaErrorT rc = kviCsSetSessionLastEvent(SessionId, Number);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSetSessionLastEvent failed. rc=%d", rc);
    return rc;
}

// Resuming at Number: active alarms put for the session that read up to
// Number go over to the session that resumes, so it does not skip them.
SaErrorT resumeAt(SaHpiSessionIdT SessionId, SaHpiUint32T Number) noexcept
{
    // The hand-over changes slots, so the lock is taken for writing.
    KVI_EQ_LOCK_RING(KviWriteLock, writer);
    if (EventQueue.Current->EventNumber == 0) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "The client said that it was resuming an event subscription at event# 0x%8.8x.  "
                 "However, we haven't gotten any events yet.",
                 Number);
        return SA_OK;
    }
    // Slot 0 is written last in the ring's first round, so an empty slot
    // does not end the search.
    KviCsEventT *found = nullptr;
    for (SaHpiInt32T i = 0; i < RingEntries && found == nullptr; i++) {
        if (EventQueue.EventQueue[i].EventNumber == Number)
            found = EventQueue.EventQueue + i;
    }
    if (found == nullptr || found->ActiveAlarm != SAHPI_TRUE)
        return SA_OK;
    const SaHpiSessionIdT previous = found->ActiveAlarmSession;
    KviCsEventT *slot = found;
    do {
        slot->ActiveAlarmSession = SessionId;
        slot = nextSlot(slot);
    } while (slot != found && slot->EventNumber != 0 && slot->ActiveAlarm == SAHPI_TRUE &&
             slot->ActiveAlarmSession == previous);
    return SA_OK;
}

// ---- Active alarms ----

// The events gathered for one subscription, grown one at a time.
struct KviAlarmListT {
    SaHpiEventT *Events = nullptr;
    SaHpiUint32T Count = 0;
};

SaErrorT appendAlarm(KviAlarmListT &List, const SaHpiEventT &Event) noexcept
{
    const SaHpiUint32T bytes = (List.Count + 1) * static_cast<SaHpiUint32T>(sizeof(SaHpiEventT));
    void *grown =
        bytes > INT32_MAX ? nullptr : KVI_CS_REALLOC(List.Events, static_cast<SaHpiInt32T>(bytes));
    if (grown == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_REALLOC failed to get %u bytes for active alarms.",
                 bytes);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    List.Events = static_cast<SaHpiEventT *>(grown);
    SaHpiEventT &alarm = List.Events[List.Count++];
    alarm = Event;
    const SaErrorT rc = kviCsGetSaHpiTime(&alarm.Timestamp);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsGetSaHpiTime failed. rc=%d", rc);
    return SA_OK;
}

// What a sensor's record gives to reach its plug-in.
struct KviSensorT {
    SaHpiRdrT Rdr;
    void *UserData;
    KviDsRdrFnTable Fn;
    KviCsRwLockT *Lock;
};

// The sensor event that ActiveAlarmTranslate starts from: the slot has no
// argument for the reading, so the current reading travels in the event as
// its trigger reading, with the event state it carried. The plug-in fills in
// the rest or overwrites all of it.
void alarmTemplate(SaHpiResourceIdT Rid, const SaHpiSensorRecT &Sensor,
                   const SaHpiSensorReadingT &Reading, SaHpiEventT *Event) noexcept
{
    memset(Event, 0, sizeof(*Event));
    Event->Source = Rid;
    Event->EventType = SAHPI_ET_SENSOR;
    SaHpiSensorEventT &e = Event->EventDataUnion.SensorEvent;
    e.SensorNum = Sensor.Num;
    e.SensorType = Sensor.Type;
    e.EventCategory = Sensor.Category;
    e.Assertion = SAHPI_TRUE;
    e.EventState = Reading.EventStatus.EventStatus;
    e.TriggerReading = Reading;
    e.OptionalDataPresent = SAHPI_SOD_TRIGGER_READING;
}

// Reads one sensor through its plug-in and asks the plug-in whether the
// reading is an alarm. The operation that reads is left to the record table;
// the reading slot is the one a client's saHpiSensorReadingGet goes through,
// called like it under the plug-in's lock. Only running out of memory ends
// the walk; everything else skips the sensor.
SaErrorT translateSensor(SaHpiDomainIdT Domain, SaHpiRptEntryT &Rpt, KviSensorT &S,
                         KviAlarmListT &List) noexcept
{
    const SaHpiSensorRecT &sensor = S.Rdr.RdrTypeUnion.SensorRec;
    const SaHpiResourceIdT rid = Rpt.ResourceId;
    if (S.Fn.SensorReadingGet == nullptr || S.Fn.ActiveAlarmTranslate == nullptr ||
        S.Lock == nullptr)
        return SA_OK;
    KVI_READ_GUARD(plugin, S.Lock, MAPL_LOCK_TIMEOUT);
    if (!plugin.held()) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't get the plug-in lock of rid %u. rc=%d", rid,
                 plugin.result());
        return SA_OK;
    }
    SaHpiSensorReadingT reading;
    memset(&reading, 0, sizeof reading);
    SaErrorT rc = S.Fn.SensorReadingGet(Domain, rid, sensor.Num, sensor.Category, &S.Rdr,
                                        S.UserData, &reading);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "saHpiSensorReadingGet failed. rc=%d", rc);
        return SA_OK;
    }
    SaHpiEventT event;
    alarmTemplate(rid, sensor, reading, &event);
    rc = S.Fn.ActiveAlarmTranslate(Domain, rid, sensor.Num, S.UserData, &S.Rdr, &Rpt, &event);
    plugin.release();
    if (rc != SA_OK) {
        // Most often the sensor is simply not in alarm.
        KVI_DLOG(KVI_LOG_DBG_H, "ActiveAlarmTranslate returned error %d", rc);
        return SA_OK;
    }
    return appendAlarm(List, event);
}

// Every sensor of one resource.
SaErrorT gatherResource(SaHpiDomainIdT Domain, SaHpiRptEntryT &Rpt, KviAlarmListT &List) noexcept
{
    const SaHpiResourceIdT rid = Rpt.ResourceId;
    if ((Rpt.ResourceCapabilities & SAHPI_CAPABILITY_SENSOR) == 0)
        return SA_OK;
    for (SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY, next = 0; entry != SAHPI_LAST_ENTRY;
         entry = next) {
        KviSensorT s{};
        SaHpiBoolT active = SAHPI_FALSE;
        const SaErrorT rc = kviCsRdrGet(Domain, rid, SAHPI_NO_RECORD, entry, &next, &s.Rdr, &active,
                                        &s.UserData, &s.Fn, nullptr, &s.Lock);
        if (rc == SA_ERR_HPI_NOT_PRESENT && entry == SAHPI_FIRST_ENTRY) {
            KVI_DLOG(KVI_LOG_DBG_H, "did %u rid %u has no RDRs!", Domain, rid);
            return SA_OK;
        }
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRdrGet failed. rc=%d, active=%d", rc, active);
            return SA_OK;
        }
        if (s.Rdr.RdrType != SAHPI_SENSOR_RDR)
            continue;
        if (active != SAHPI_TRUE) {
            KVI_DLOG(KVI_LOG_DBG_H, "rdr entry did=%u, rid=%u, s=%u is inactive. rc=%d, active=%d",
                     Domain, rid, s.Rdr.RdrTypeUnion.SensorRec.Num, rc, active);
            continue;
        }
        const SaErrorT added = translateSensor(Domain, Rpt, s, List);
        if (added != SA_OK)
            return added;
    }
    return SA_OK;
}

// Every sensor of every active resource.
SaErrorT gatherAlarms(SaHpiDomainIdT Domain, KviAlarmListT &List) noexcept
{
    for (SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY, next = 0; entry != SAHPI_LAST_ENTRY;
         entry = next) {
        SaHpiRptEntryT rpt;
        const SaErrorT rc = kviCsRptActiveEntryGet(Domain, entry, &next, &rpt, nullptr);
        if (rc == SA_ERR_HPI_NOT_PRESENT && entry == SAHPI_FIRST_ENTRY) {
            KVI_DLOG(KVI_LOG_DBG_H, "did %u has no RPT entries!", Domain);
            return SA_OK;
        }
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRptActiveEntryGet failed. rc=%d", rc);
            return SA_ERR_HPI_ERROR;
        }
        const SaErrorT gathered = gatherResource(Domain, rpt, List);
        if (gathered != SA_OK)
            return gathered;
    }
    return SA_OK;
}

} // namespace

extern "C" {

SaErrorT kviCsEventQueueInitialize(void) noexcept
{
    KVI_TRACE("");
    QueueEntries.store(configuredEntries());
    const SaErrorT rc = kviCsEventQueueCreate(SAHPI_DEFAULT_DOMAIN_ID);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsEventQueueCreate failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsEventQueueFinalize(void) noexcept
{
    KVI_TRACE("");
    const SaErrorT rc = kviCsEventQueueRemove(SAHPI_DEFAULT_DOMAIN_ID);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsEventQueueRemove failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsEventQueueCreate(SaHpiDomainIdT DomainId) noexcept
{
    KVI_TRACE("DomainId: %u", DomainId);
    KVI_EQ_DOMAIN_CHECK(DomainId);
    SaErrorT rc = setUpPrimitives();
    if (rc != SA_OK)
        return rc;
    const SaHpiInt32T entries = QueueEntries.load();
    const uint64_t bytes = static_cast<uint64_t>(entries) * sizeof(KviCsEventT);
    auto *ring = bytes > INT32_MAX ? nullptr : static_cast<KviCsEventT *>(KVI_CS_MALLOC(bytes));
    if (ring == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "KVI_CS_MALLOC failed: %d bytes for event queue.",
                 static_cast<SaHpiInt32T>(bytes > INT32_MAX ? INT32_MAX : bytes));
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    memset(static_cast<void *>(ring), 0, bytes); // every EventNumber 0: never written
    KVI_WRITE_GUARD(writer, &EventQueue.EventQueueLock, EVENT_QUEUE_LOCK_TIMEOUT);
    if (!writer.held()) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't get EventQueueLock.");
        KVI_CS_FREE(ring);
        return SA_ERR_HPI_ERROR;
    }
    KviCsEventT *old = EventQueue.EventQueue;
    EventQueue.EventQueue = ring;
    EventQueue.Current = ring;
    RingEntries = entries;
    EventQueue.LastEventNumber.store(1);
    EventQueue.QueueShutdown.store(SAHPI_FALSE);
    writer.release();
    if (old != nullptr)
        KVI_CS_FREE(old); // created twice without a removal in between
    return SA_OK;
}

SaErrorT kviCsEventQueueRemove(SaHpiDomainIdT DomainId) noexcept
{
    KVI_TRACE("DomainId: %u", DomainId);
    KVI_EQ_DOMAIN_CHECK(DomainId);
    if (!PrimitivesReady.load(std::memory_order_acquire))
        return SA_OK; // never created
    {
        KviQueueMutexGuard mutex(KVI_CALL_SITE("EventQueueMutex"));
        if (!mutex.held())
            return SA_ERR_HPI_ERROR;
        EventQueue.QueueShutdown.store(SAHPI_TRUE);
        pthread_cond_broadcast(&EventQueue.EventQueueCond);
    }
    KVI_WRITE_GUARD(writer, &EventQueue.EventQueueLock, EVENT_QUEUE_LOCK_TIMEOUT);
    if (!writer.held()) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't get EventQueueLock.");
        return SA_ERR_HPI_ERROR;
    }
    KviCsEventT *ring = EventQueue.EventQueue;
    EventQueue.EventQueue = nullptr;
    EventQueue.Current = nullptr;
    writer.release();
    if (ring != nullptr)
        KVI_CS_FREE(ring);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsPutEvent(SaHpiDomainIdT DomainId, SaHpiEventT *Events,
                                  SaHpiInt32T NumberOfEvents, SaHpiBoolT ActiveAlarm,
                                  SaHpiSessionIdT ActiveAlarmSessionId,
                                  SaHpiUint32T *EventNumber) noexcept
{
    KVI_TRACE("DomainId: %u, NumberOfEvents: %d, ActiveAlarm: %d", DomainId, NumberOfEvents,
              ActiveAlarm);
    KVI_NULL_CHECK(Events);
    if (NumberOfEvents < 1) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Tried to add %u entries to the queue.",
                 static_cast<SaHpiUint32T>(NumberOfEvents));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    const SaHpiInt32T entries = QueueEntries.load();
    if (NumberOfEvents > entries) {
        KVI_WLOG(KVI_LOG_WARN,
                 "Adding %u events to an event queue that has only %d entries.  You just lost the "
                 "first %d events.  Recommend increasing the value of KviEventQueueSize in the "
                 "config file.",
                 static_cast<SaHpiUint32T>(NumberOfEvents), entries, NumberOfEvents - entries);
    }
    KVI_EQ_DOMAIN_CHECK(DomainId);
    if (EventQueue.QueueShutdown.load() == SAHPI_TRUE) {
        KVI_WLOG(KVI_LOG_WARN, KVI_EQ_SHUTDOWN_TEXT);
        return SA_ERR_HPI_ERROR;
    }
    if (!PrimitivesReady.load(std::memory_order_acquire)) {
        KVI_WLOG(KVI_LOG_WARN, KVI_EQ_NO_RING_TEXT); // no queue was ever created
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    KVI_EQ_LOCK_RING(KviWriteLock, writer);
    const SaHpiUint32T first =
        writeEvents(Events, NumberOfEvents, ActiveAlarm, ActiveAlarmSessionId);
    writer.release();
    if (EventNumber != nullptr)
        *EventNumber = first;
    // The one reader of active alarms is the subscriber putting them.
    if (ActiveAlarm == SAHPI_TRUE)
        return SA_OK;
    return broadcast(KVI_CALL_SITE("EventQueueMutex"));
}

SaErrorT kviCsGetEvent(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout, SaHpiEventT *Event,
                       SaHpiUint32T *EventNumber) noexcept
{
    KVI_TRACE("SessionId: %u, Timeout: %lld", SessionId, static_cast<long long>(Timeout));
    KVI_NULL_CHECK(Event);
    KVI_NULL_CHECK(EventNumber);
    struct timespec deadline;
    SaErrorT rc = deadlineAfter(Timeout, &deadline);
    if (rc != SA_OK)
        return rc;
    SaHpiDomainIdT domain = 0;
    rc = kviCsGetDomainFromSession(SessionId, &domain);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsGetDomainFromSession failed. rc=%d", rc);
        return SA_ERR_HPI_INVALID_SESSION;
    }
    if (EventQueue.QueueShutdown.load() == SAHPI_TRUE) {
        KVI_WLOG(KVI_LOG_WARN, KVI_EQ_SHUTDOWN_TEXT);
        return SA_ERR_HPI_ERROR;
    }
    SaHpiUint32T lastRead = 0;
    rc = kviCsGetSessionLastEvent(SessionId, &lastRead);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsGetSessionLastEvent failed. rc=%d", rc);
        return rc;
    }
    for (;;) {
        rc = waitForEvent(SessionId, Timeout, deadline, lastRead);
        if (rc != SA_OK)
            return rc;
        KviNextEventT next{};
        rc = readAfter(SessionId, lastRead, Event, &next);
        if (rc != SA_OK)
            return rc;
        const bool inOrder = next.Number == successor(lastRead);
        if (storeLastRead(SessionId, next.Number) != SA_OK)
            return SA_ERR_HPI_ERROR;
        lastRead = next.Number;
        if (next.OthersAlarm)
            continue;
        *EventNumber = next.Number;
        // The event is delivered either way; the code tells of a gap before it.
        return inOrder ? SA_OK : SA_ERR_HPI_DATA_TRUNCATED;
    }
}

SaErrorT kviCsSignalEventThreads(void) noexcept
{
    KVI_TRACE("");
    if (!PrimitivesReady.load(std::memory_order_acquire))
        return SA_OK; // no queue yet, so nobody waits
    return broadcast(KVI_CALL_SITE("EventQueueMutex"));
}

SaErrorT kviCsSubscribe(SaHpiSessionIdT SessionId, SaHpiBoolT ProvideActiveAlarms,
                        SaHpiUint32T *InitialEvent) noexcept
{
    KVI_TRACE("SessionId: %u, ProvideActiveAlarms: %d", SessionId, ProvideActiveAlarms);
    KVI_NULL_CHECK(InitialEvent);
    if (ProvideActiveAlarms > SAHPI_TRUE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Non-Bool value (%d) in ProvideActiveAlarms.",
                 ProvideActiveAlarms);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SaErrorT rc = SA_OK;
    if (*InitialEvent != 0) {
        if (ProvideActiveAlarms == SAHPI_TRUE) {
            KVI_DLOG(KVI_LOG_DBG_H, "Request for active alarms during a resubscribe is not legal.");
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        rc = resumeAt(SessionId, *InitialEvent);
        if (rc != SA_OK)
            return rc;
    } else {
        *InitialEvent = EventQueue.LastEventNumber.load();
    }
    rc = kviCsSetSessionEventSubscription(SessionId, SAHPI_TRUE, *InitialEvent);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSetSessionEventSubscription failed. rc=%d", rc);
        return rc;
    }
    if (ProvideActiveAlarms != SAHPI_TRUE)
        return SA_OK;
    rc = kviCsProcessActiveAlarms(SessionId, InitialEvent);
    if (rc == SA_OK)
        return SA_OK;
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsProcessActiveAlarms failed. rc=%d", rc);
    const SaErrorT undo = kviCsUnsubscribe(SessionId);
    return undo != SA_OK ? undo : rc;
}

SaErrorT kviCsUnsubscribe(SaHpiSessionIdT SessionId) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    const SaErrorT rc = kviCsSetSessionEventSubscription(SessionId, SAHPI_FALSE, 0);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSetSessionEventSubscription failed. rc=%d", rc);
    return rc;
}

SaErrorT kviCsProcessActiveAlarms(SaHpiSessionIdT SessionId, SaHpiUint32T *InitialEvent) noexcept
{
    KVI_TRACE("SessionId: %u", SessionId);
    KVI_NULL_CHECK(InitialEvent);
    SaHpiDomainIdT domain = 0;
    if (kviCsGetDomainFromSession(SessionId, &domain) != SA_OK)
        return SA_ERR_HPI_INVALID_SESSION;
    KviAlarmListT list;
    SaErrorT rc = gatherAlarms(domain, list);
    if (rc != SA_OK || list.Count == 0) {
        if (list.Events != nullptr)
            KVI_CS_FREE(list.Events);
        return rc;
    }
    SaHpiUint32T first = 0;
    rc = kviCsPutEvent(domain, list.Events, static_cast<SaHpiInt32T>(list.Count), SAHPI_TRUE,
                       SessionId, &first);
    KVI_CS_FREE(list.Events);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsPutEvent failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    // The session's position is the first alarm, so that alarm itself is
    // never delivered to it; that has always been so and clients expect it.
    rc = storeLastRead(SessionId, first);
    if (rc != SA_OK)
        return rc;
    *InitialEvent = first;
    return SA_OK;
}

} // extern "C"

SaErrorT kviCsEventQueueSetLastEventNumber(SaHpiUint32T LastEventNumber) noexcept
{
    KVI_TRACE("LastEventNumber: %u", LastEventNumber);
    KVI_WRITE_GUARD(writer, &EventQueue.EventQueueLock, EVENT_QUEUE_LOCK_TIMEOUT);
    if (!writer.held())
        return SA_ERR_HPI_ERROR;
    EventQueue.LastEventNumber.store(LastEventNumber);
    return SA_OK;
}

SaHpiInt32T kviCsEventQueueEntries() noexcept
{
    return QueueEntries.load();
}
