// Each resource's event log: entries oldest first, a clock of its own that
// clients may set, an enable state, and wrapping when full. The entries are
// allocated with the first one, so a shelf of hundreds of resources costs
// nothing until their logs are used.
#include <cstring>

#include "SimModel.h"

namespace
{

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

// Every subscribed session sees the event. A queue that is not there (the
// library not initialized) loses it; the library says so in its log.
void postEvent(SaHpiDomainIdT DomainId, SaHpiEventT *Event) noexcept
{
    kviCsPutEvent(DomainId, Event, 1, SAHPI_FALSE, 0, nullptr);
}

} // namespace

// ---- Model ----

void simPublishEvent(SimResourceT *Resource, SaHpiEventT *Event) noexcept
{
    if (Resource->Log.Enabled && append(Resource->Log, Event) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: event log of rid=%u out of memory",
                 Resource->ResourceId);
    }
    postEvent(Resource->DomainId, Event);
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
    return simReadResource(UserDefined, Info, [](const SimResourceT &R) {
        const SimEventLogT &log = R.Log;
        SaHpiSelInfoT info;
        memset(&info, 0, sizeof(info));
        info.Entries = log.Count;
        info.Size = log.Size;
        info.UpdateTimestamp = log.UpdateTimestamp;
        info.CurrentTime = logNow(log);
        info.Enabled = log.Enabled;
        info.OverflowFlag = log.OverflowFlag;
        info.OverflowAction = SAHPI_SEL_OVERFLOW_WRAP;
        info.DeleteEntrySupported = SAHPI_TRUE;
        return info;
    });
}

SaErrorT simEventLogEntryGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT, SaHpiSelEntryIdT EntryId,
                             void *UserDefined, SaHpiSelEntryIdT *PrevEntryId,
                             SaHpiSelEntryIdT *NextEntryId, SaHpiSelEntryT *EventLogEntry,
                             SaHpiRdrT *Rdr, SaHpiRptEntryT *RptEntry) noexcept
{
    if (PrevEntryId == nullptr || NextEntryId == nullptr || EventLogEntry == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SaHpiSelEntryT entry;
    SaErrorT rc = simWithResource(UserDefined, [&](SimResourceT &R) {
        const SimEventLogT &log = R.Log;
        SaHpiUint32T i = 0;
        SaErrorT found = find(log, EntryId, &i);
        if (found == SA_OK) {
            entry = log.Entries[i];
            *PrevEntryId = i > 0 ? log.Entries[i - 1].EntryId : SAHPI_NO_MORE_ENTRIES;
            *NextEntryId = i + 1 < log.Count ? log.Entries[i + 1].EntryId : SAHPI_NO_MORE_ENTRIES;
        }
        return found;
    });
    if (rc != SA_OK) {
        return rc;
    }
    *EventLogEntry = entry;
    describe(DomainId, &entry.Event, Rdr, RptEntry);
    return SA_OK;
}

SaErrorT simEventLogEntryAdd(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryT *EvtEntry,
                             void *UserDefined) noexcept
{
    if (EvtEntry == nullptr || UserDefined == nullptr || !validEvent(&EvtEntry->Event)) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    // A client's entry is taken even while the log is disabled: disabling
    // stops the resource's own logging only. The entry's event is an event
    // like any other of its type, so subscribers see it too.
    SaHpiDomainIdT domain = 0;
    SaErrorT rc = simWithResource(UserDefined, [&](SimResourceT &R) {
        domain = R.DomainId;
        return append(R.Log, &EvtEntry->Event);
    });
    if (rc == SA_OK) {
        postEvent(domain, &EvtEntry->Event);
    }
    return rc;
}

SaErrorT simEventLogEntryDelete(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryIdT EntryId,
                                void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        SimEventLogT &log = R.Log;
        SaHpiUint32T i = 0;
        SaErrorT rc = find(log, EntryId, &i);
        if (rc != SA_OK) {
            return rc;
        }
        memmove(log.Entries + i, log.Entries + i + 1, (log.Count - i - 1) * sizeof(SaHpiSelEntryT));
        log.Count--;
        log.UpdateTimestamp = logNow(log);
        return SA_OK;
    });
}

SaErrorT simEventLogClear(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [](SimResourceT &R) {
        R.Log.Count = 0;
        R.Log.OverflowFlag = SAHPI_FALSE;
        R.Log.UpdateTimestamp = logNow(R.Log);
        return SA_OK;
    });
}

SaErrorT simEventLogTimeGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                            SaHpiTimeT *Time) noexcept
{
    return simReadResource(UserDefined, Time, [](const SimResourceT &R) { return logNow(R.Log); });
}

SaErrorT simEventLogTimeSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiTimeT Time,
                            void *UserDefined) noexcept
{
    if (UserDefined == nullptr || Time == SAHPI_TIME_UNSPECIFIED) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SaHpiTimeT now = simNow();
    if (now == SAHPI_TIME_UNSPECIFIED) {
        return SA_ERR_HPI_ERROR;
    }
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        R.Log.Offset = Time - now;
        return SA_OK;
    });
}

SaErrorT simEventLogStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                             SaHpiBoolT *Enable) noexcept
{
    return simReadResource(UserDefined, Enable,
                           [](const SimResourceT &R) { return R.Log.Enabled; });
}

SaErrorT simEventLogStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiBoolT Enable,
                             void *UserDefined) noexcept
{
    if (Enable > SAHPI_TRUE) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        R.Log.Enabled = Enable;
        return SA_OK;
    });
}
