// Each resource's event log: entries oldest first, a clock of its own that
// clients may set, an enable state, and wrapping when full. The entries are
// allocated with the first one, so a shelf of hundreds of resources costs
// nothing until their logs are used.
#include <cstring>

#include "SimModel.h"

namespace
{

SimResourceT *resourceOf(void *UserDefined) noexcept
{
    return static_cast<SimResourceT *>(UserDefined);
}

SaHpiTimeT logNow(const SimEventLogT &Log) noexcept
{
    SaHpiTimeT now = simNow();
    return now == SAHPI_TIME_UNSPECIFIED ? now : now + Log.Offset;
}

// Entry ids grow from 1 and are not reused until they wrap; the values that
// name the oldest, the newest and the end of the log are never handed out.
SaHpiSelEntryIdT nextId(SimEventLogT &Log) noexcept
{
    while (Log.NextId == SAHPI_OLDEST_ENTRY || Log.NextId == SAHPI_NO_MORE_ENTRIES ||
           Log.NextId == SAHPI_NEWEST_ENTRY) {
        Log.NextId++;
    }
    return Log.NextId++;
}

SaErrorT append(SimEventLogT &Log, const SaHpiEventT *Event) noexcept
{
    if (Log.Entries == nullptr) {
        Log.Entries =
            static_cast<SaHpiSelEntryT *>(KVI_CS_MALLOC(Log.Size * sizeof(SaHpiSelEntryT)));
        if (Log.Entries == nullptr) {
            return SA_ERR_HPI_OUT_OF_SPACE;
        }
    }
    if (Log.Count == Log.Size) {
        // Full: the oldest entry makes room.
        memmove(Log.Entries, Log.Entries + 1, (Log.Size - 1) * sizeof(SaHpiSelEntryT));
        Log.Count--;
        Log.OverflowFlag = SAHPI_TRUE;
    }
    SaHpiSelEntryT &entry = Log.Entries[Log.Count++];
    entry.EntryId = nextId(Log);
    entry.Timestamp = logNow(Log);
    entry.Event = *Event;
    Log.UpdateTimestamp = entry.Timestamp;
    return SA_OK;
}

// The index of an entry named by id, or by the oldest/newest cursor.
SaErrorT find(const SimEventLogT &Log, SaHpiSelEntryIdT EntryId, SaHpiUint32T *Index) noexcept
{
    if (EntryId == SAHPI_NO_MORE_ENTRIES) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (Log.Count == 0) {
        return SA_ERR_HPI_NOT_PRESENT;
    }
    if (EntryId == SAHPI_OLDEST_ENTRY) {
        *Index = 0;
        return SA_OK;
    }
    if (EntryId == SAHPI_NEWEST_ENTRY) {
        *Index = Log.Count - 1;
        return SA_OK;
    }
    for (SaHpiUint32T i = 0; i < Log.Count; i++) {
        if (Log.Entries[i].EntryId == EntryId) {
            *Index = i;
            return SA_OK;
        }
    }
    return SA_ERR_HPI_NOT_PRESENT;
}

bool validEvent(const SaHpiEventT *Event) noexcept
{
    SaHpiUint32T severity = simRaw(Event->Severity);
    return simRaw(Event->EventType) <= SAHPI_ET_USER &&
           (severity <= SAHPI_OK || severity == SAHPI_DEBUG);
}

// The records an entry refers to, looked up in the library's tables after
// the log's lock is dropped: the table lock comes after ours nowhere else.
void describe(SaHpiDomainIdT DomainId, const SaHpiEventT *Event, SaHpiRdrT *Rdr,
              SaHpiRptEntryT *RptEntry) noexcept
{
    SaHpiBoolT active = SAHPI_FALSE;
    if (RptEntry != nullptr &&
        kviCsRptEntryGetByRid(DomainId, Event->Source, RptEntry, &active, nullptr) != SA_OK) {
        memset(RptEntry, 0, sizeof(*RptEntry)); // no capabilities: no resource
    }
    if (Rdr == nullptr) {
        return;
    }
    SaErrorT rc = SA_ERR_HPI_NOT_PRESENT;
    if (Event->EventType == SAHPI_ET_SENSOR) {
        rc = kviCsRdrGetSensor(DomainId, Event->Source, Event->EventDataUnion.SensorEvent.SensorNum,
                               Rdr, &active, nullptr, nullptr, nullptr, nullptr);
    } else if (Event->EventType == SAHPI_ET_WATCHDOG) {
        rc = kviCsRdrGetWatchdog(DomainId, Event->Source,
                                 Event->EventDataUnion.WatchdogEvent.WatchdogNum, Rdr, &active,
                                 nullptr, nullptr, nullptr, nullptr);
    }
    if (rc != SA_OK) {
        memset(Rdr, 0, sizeof(*Rdr));
        Rdr->RdrType = SAHPI_NO_RECORD;
    }
}

} // namespace

// ---- Model ----

void simPublishEvent(SimResourceT *Resource, SaHpiEventT *Event) noexcept
{
    if (Resource->Log.Enabled && append(Resource->Log, Event) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: event log of rid=%u out of memory",
                 Resource->ResourceId);
    }
    // The library's event queue takes the event here once it offers plug-ins
    // a way to post events through its public header.
}

void simEventLogRelease(SimEventLogT *Log) noexcept
{
    if (Log->Entries != nullptr) {
        KVI_CS_FREE(Log->Entries);
    }
    Log->Count = 0;
}

// ---- Slots ----

SaErrorT simEventLogInfoGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                            SaHpiSelInfoT *Info) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || Info == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    const SimEventLogT &log = resource->Log;
    memset(Info, 0, sizeof(*Info));
    Info->Entries = log.Count;
    Info->Size = log.Size;
    Info->UpdateTimestamp = log.UpdateTimestamp;
    Info->CurrentTime = logNow(log);
    Info->Enabled = log.Enabled;
    Info->OverflowFlag = log.OverflowFlag;
    Info->OverflowAction = SAHPI_SEL_OVERFLOW_WRAP;
    Info->DeleteEntrySupported = SAHPI_TRUE;
    return SA_OK;
}

SaErrorT simEventLogEntryGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT, SaHpiSelEntryIdT EntryId,
                             void *UserDefined, SaHpiSelEntryIdT *PrevEntryId,
                             SaHpiSelEntryIdT *NextEntryId, SaHpiSelEntryT *EventLogEntry,
                             SaHpiRdrT *Rdr, SaHpiRptEntryT *RptEntry) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || PrevEntryId == nullptr || NextEntryId == nullptr ||
        EventLogEntry == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SaHpiSelEntryT entry;
    {
        SimLock lock(resource);
        const SimEventLogT &log = resource->Log;
        SaHpiUint32T i = 0;
        SaErrorT rc = find(log, EntryId, &i);
        if (rc != SA_OK) {
            return rc;
        }
        entry = log.Entries[i];
        *PrevEntryId = i > 0 ? log.Entries[i - 1].EntryId : SAHPI_NO_MORE_ENTRIES;
        *NextEntryId = i + 1 < log.Count ? log.Entries[i + 1].EntryId : SAHPI_NO_MORE_ENTRIES;
    }
    *EventLogEntry = entry;
    describe(DomainId, &entry.Event, Rdr, RptEntry);
    return SA_OK;
}

SaErrorT simEventLogEntryAdd(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryT *EvtEntry,
                             void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || EvtEntry == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (!validEvent(&EvtEntry->Event)) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    // A client's entry is taken even while the log is disabled: disabling
    // stops the resource's own logging only.
    return append(resource->Log, &EvtEntry->Event);
}

SaErrorT simEventLogEntryDelete(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryIdT EntryId,
                                void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    SimEventLogT &log = resource->Log;
    SaHpiUint32T i = 0;
    SaErrorT rc = find(log, EntryId, &i);
    if (rc != SA_OK) {
        return rc;
    }
    memmove(log.Entries + i, log.Entries + i + 1, (log.Count - i - 1) * sizeof(SaHpiSelEntryT));
    log.Count--;
    log.UpdateTimestamp = logNow(log);
    return SA_OK;
}

SaErrorT simEventLogClear(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    SimEventLogT &log = resource->Log;
    log.Count = 0;
    log.OverflowFlag = SAHPI_FALSE;
    log.UpdateTimestamp = logNow(log);
    return SA_OK;
}

SaErrorT simEventLogTimeGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                            SaHpiTimeT *Time) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || Time == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *Time = logNow(resource->Log);
    return SA_OK;
}

SaErrorT simEventLogTimeSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiTimeT Time,
                            void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || Time == SAHPI_TIME_UNSPECIFIED) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SaHpiTimeT now = simNow();
    if (now == SAHPI_TIME_UNSPECIFIED) {
        return SA_ERR_HPI_ERROR;
    }
    SimLock lock(resource);
    resource->Log.Offset = Time - now;
    return SA_OK;
}

SaErrorT simEventLogStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                             SaHpiBoolT *Enable) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || Enable == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *Enable = resource->Log.Enabled;
    return SA_OK;
}

SaErrorT simEventLogStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiBoolT Enable,
                             void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || Enable > SAHPI_TRUE) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    resource->Log.Enabled = Enable;
    return SA_OK;
}
