// The three actions of HPI parameter control on one resource: back to the
// defaults, save the current settings, put the saved settings back. The
// resource goes first, through its own table, then each of its records
// through theirs. This unit also holds the library's ready-made resource and
// sensor implementations of the table slots; the control ones are in
// ControlHelpers.
//
// No action rolls back: whatever was done before a failure stays done.
#include <cstring>

#include "core/SaHpi/parmControl/ParmControlHelpers.h"

namespace
{

// What kviCsParmControl says about the resource's own slot, by action.
struct RptActionTextsT {
    const char *Doing;
    const char *NoSlot;
    const char *Failed;
};
constexpr RptActionTextsT RPT_ACTION_TEXTS[] = {
    {"Restore default parm control",
     "RptDefaultParmControl is NULL. Skipping RPT entry default parm control restore.",
     "RptDefaultParmControl failed. rc=%d, rid=%u"},
    {"Save parm control", ">RptSaveParmControl is NULL. Skipping RPT entry save parm control",
     "RptSaveParmControl failed. rc=%d, rid=%u"},
    {"Restore saved parm control",
     ">RptRestoreParmControl is NULL. Skipping RPT entry restore parm control",
     "RptRestoreParmControl failed. rc=%d, rid=%u"},
};

// And about a record's slot.
struct RdrActionTextsT {
    const char *NoSlot;
    const char *Failed;
};
constexpr RdrActionTextsT RDR_ACTION_TEXTS[] = {
    {"RdrDefaultParmControl is NULL. Skipping RDR.", "RdrDefaultParmControl failed. rc %d"},
    {"RdrSaveParmControl is NULL. Skipping RDR.", "RdrSaveParmControl failed. rc %d"},
    {"RdrRestoreParmControl is NULL. Skipping RDR.", "RdrRestoreParmControl failed. rc %d"},
};

// An action as a client sent it, before it is known to be one of the three.
using RawActionT = std::underlying_type_t<SaHpiParmActionT>;

bool validAction(RawActionT Action) noexcept
{
    return Action >= SAHPI_DEFAULT_PARM && Action <= SAHPI_RESTORE_PARM;
}

// Calls the resource's slot for Action; false when the slot is empty.
bool callRptSlot(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiParmActionT Action,
                 KviDsRptFnTable *FnTable, void *UserDefined, SaErrorT *Rc) noexcept
{
    switch (Action) {
    case SAHPI_DEFAULT_PARM:
        if (FnTable->RptDefaultParmControl == nullptr)
            return false;
        *Rc = FnTable->RptDefaultParmControl(DomainId, ResourceId);
        return true;
    case SAHPI_SAVE_PARM:
        if (FnTable->RptSaveParmControl == nullptr)
            return false;
        *Rc = FnTable->RptSaveParmControl(DomainId, ResourceId, FnTable, UserDefined);
        return true;
    default:
        if (FnTable->RptRestoreParmControl == nullptr)
            return false;
        *Rc =
            FnTable->RptRestoreParmControl(DomainId, ResourceId, FnTable, UserDefined, SAHPI_FALSE);
        return true;
    }
}

// The same for a record.
bool callRdrSlot(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiParmActionT Action,
                 KviRdrVisitT *Record, SaErrorT *Rc) noexcept
{
    KviDsRdrFnTable *table = &Record->FnTable;
    switch (Action) {
    case SAHPI_DEFAULT_PARM:
        if (table->RdrDefaultParmControl == nullptr)
            return false;
        *Rc = table->RdrDefaultParmControl(DomainId, ResourceId, &Record->Rdr, table,
                                           Record->UserData);
        return true;
    case SAHPI_SAVE_PARM:
        if (table->RdrSaveParmControl == nullptr)
            return false;
        *Rc =
            table->RdrSaveParmControl(DomainId, ResourceId, &Record->Rdr, table, Record->UserData);
        return true;
    default:
        if (table->RdrRestoreParmControl == nullptr)
            return false;
        *Rc = table->RdrRestoreParmControl(DomainId, ResourceId, SAHPI_FALSE, &Record->Rdr, table,
                                           Record->UserData);
        return true;
    }
}

// Controls, sensors and inventories take part in parameter control; the
// rest (watchdogs) have nothing to keep.
bool takesPart(SaHpiResourceIdT ResourceId, const SaHpiRdrT &Rdr) noexcept
{
    switch (Rdr.RdrType) {
    case SAHPI_CTRL_RDR:
        KVI_DLOG(KVI_LOG_DBG_L, "ResId %d. Sahpi CtrlNum %d", ResourceId,
                 Rdr.RdrTypeUnion.CtrlRec.Num);
        return true;
    case SAHPI_SENSOR_RDR:
        KVI_DLOG(KVI_LOG_DBG_L, "ResId %d. Sahpi SensNum %d", ResourceId,
                 Rdr.RdrTypeUnion.SensorRec.Num);
        return true;
    case SAHPI_INVENTORY_RDR:
        KVI_DLOG(KVI_LOG_DBG_L, "ResId %d. Sahpi EirId %d", ResourceId,
                 Rdr.RdrTypeUnion.InventoryRec.EirId);
        return true;
    default:
        KVI_DLOG(KVI_LOG_DBG_L, "Ignoring Rdr. Type %d", Rdr.RdrType);
        return false;
    }
}

SaErrorT performOnRecord(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, KviRdrVisitT *Record,
                         void *Context) noexcept
{
    RawActionT raw = *static_cast<const RawActionT *>(Context);
    if (!takesPart(ResourceId, Record->Rdr))
        return SA_OK;
    if (!validAction(raw)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Parm Control Action");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    auto action = static_cast<SaHpiParmActionT>(raw);
    const RdrActionTextsT &texts = RDR_ACTION_TEXTS[action];
    SaErrorT rc = SA_OK;
    if (!callRdrSlot(DomainId, ResourceId, action, Record, &rc))
        KVI_DLOG(KVI_LOG_DBG_L, "%s", texts.NoSlot);
    else if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, texts.Failed, rc);
    return rc;
}

// ---------------------------------------------------------------------------
// Resource settings

constexpr KviRestoreTextsT TAG_TEXTS = {"Parm control restore was called without a save done first",
                                        SA_ERR_HPI_INVALID_REQUEST,
                                        "Failed to get resource tag from NV", true};
constexpr KviRestoreTextsT SEVERITY_TEXTS = {"Could not find severity", SA_ERR_HPI_ERROR,
                                             "Failed to get resource severity from NV", true};
constexpr KviRestoreTextsT EVENT_LOG_TEXTS = {"Could not restore event log state", SA_ERR_HPI_ERROR,
                                              "kviCsGetEvtLogStNV failed. rc=%d", false};

// A failing read of the state stops the save; a failing store of it only
// gets logged, the tag and severity are still worth saving.
SaErrorT saveEventLogState(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                           KviDsRptFnTable *FnTable, void *UserDefined) noexcept
{
    if (FnTable->EventLogStateGet == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_L, "Event log state not saved");
        return SA_OK;
    }
    SaHpiBoolT enable = SAHPI_FALSE;
    SaErrorT rc = FnTable->EventLogStateGet(DomainId, ResourceId, UserDefined, &enable);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "EventLogStateGet failed. rc=%d", rc);
        return rc;
    }
    rc = kviCsSaveEvtLogStNV(DomainId, ResourceId, SAHPI_FALSE, enable);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSaveEvtLogStNV failed. rc=%d", rc);
    return SA_OK;
}

SaErrorT restoreTag(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                    SaHpiBoolT DaemonRestore) noexcept
{
    SaHpiTextBufferT tag;
    bool found = false;
    SaErrorT rc =
        kviCsRestoreReadResult(kviCsGetResTagNV(DomainId, ResourceId, DaemonRestore, &tag),
                               DaemonRestore, TAG_TEXTS, &found);
    if (rc != SA_OK || !found)
        return rc;
    KVI_DLOG(KVI_LOG_DBG_L, "Restoring resource tag.");
    rc = kviCsRptEntryModifyTagByRid(DomainId, ResourceId, &tag);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to set resource tag");
    return rc;
}

// The severity is read from the explicit save's copy even in a daemon
// restore, unlike the tag and the event-log state.
SaErrorT restoreSeverity(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                         SaHpiBoolT DaemonRestore) noexcept
{
    SaHpiSeverityT severity = SAHPI_OK;
    bool found = false;
    SaErrorT rc =
        kviCsRestoreReadResult(kviCsGetResSeverityNV(DomainId, ResourceId, SAHPI_FALSE, &severity),
                               DaemonRestore, SEVERITY_TEXTS, &found);
    if (rc != SA_OK || !found)
        return rc;
    KVI_DLOG(KVI_LOG_DBG_L, "Restoring resource severity.");
    rc = kviCsRptEntryModifySeverityByRid(DomainId, ResourceId, severity);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to set resource severity");
    return rc;
}

SaErrorT restoreEventLogState(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                              KviDsRptFnTable *FnTable, void *UserDefined,
                              SaHpiBoolT DaemonRestore) noexcept
{
    SaHpiBoolT enable = SAHPI_FALSE;
    bool found = false;
    SaErrorT rc =
        kviCsRestoreReadResult(kviCsGetEvtLogStNV(DomainId, ResourceId, DaemonRestore, &enable),
                               DaemonRestore, EVENT_LOG_TEXTS, &found);
    if (rc != SA_OK || !found)
        return rc;
    if (FnTable->EventLogStateSet == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_L, "EventLogStateSet is NULL.");
        return SA_OK;
    }
    rc = FnTable->EventLogStateSet(DomainId, ResourceId, enable, UserDefined);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not restore event log state. %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

// ---------------------------------------------------------------------------
// Sensor settings

constexpr KviRestoreTextsT THRESHOLD_TEXTS = {
    "Parm control restore was called without a save done first", SA_ERR_HPI_INVALID_REQUEST,
    "Failed to get sensor thresholds from NV", false};
constexpr KviRestoreTextsT EVENT_ENABLE_TEXTS = {"Could not find events", SA_ERR_HPI_ERROR,
                                                 "Failed to get sensor events from NV", false};

// Each threshold and the bit of the record's WriteThold that makes it
// writable. The hysteresis values are written as saved.
struct WritableThresholdT {
    SaHpiSensorThdMaskT Mask;
    SaHpiSensorReadingT SaHpiSensorThresholdsT::*Field;
};
constexpr WritableThresholdT WRITABLE_THRESHOLDS[] = {
    {SAHPI_STM_LOW_MINOR, &SaHpiSensorThresholdsT::LowMinor},
    {SAHPI_STM_LOW_MAJOR, &SaHpiSensorThresholdsT::LowMajor},
    {SAHPI_STM_LOW_CRIT, &SaHpiSensorThresholdsT::LowCritical},
    {SAHPI_STM_UP_MINOR, &SaHpiSensorThresholdsT::UpMinor},
    {SAHPI_STM_UP_MAJOR, &SaHpiSensorThresholdsT::UpMajor},
    {SAHPI_STM_UP_CRIT, &SaHpiSensorThresholdsT::UpCritical},
};

// A plug-in that offers threshold sensors must fill SensorThresholdsGet; an
// empty slot is answered as a failed read rather than followed.
SaErrorT saveThresholds(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                        KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    const SaHpiSensorRecT &sensor = Rdr->RdrTypeUnion.SensorRec;
    if (!sensor.ThresholdDefn.IsThreshold) {
        KVI_DLOG(KVI_LOG_DBG_H, "Sensor does not support thresholds. None Saved");
        return SA_OK;
    }
    SaHpiSensorThresholdsT thresholds;
    memset(&thresholds, 0, sizeof thresholds);
    SaErrorT rc = FnTable->SensorThresholdsGet == nullptr
                      ? SA_ERR_HPI_INVALID_CMD
                      : FnTable->SensorThresholdsGet(DomainId, ResourceId, sensor.Num, Rdr,
                                                     UserData, &thresholds);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsSensorThresholdsGet failed. rc %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "Saving Thresholds in NV Mem.");
    rc = kviCsSaveThreshNV(DomainId, ResourceId, sensor.Num, SAHPI_FALSE, &thresholds);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsSaveThreshNV failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT saveEventEnables(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                          KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    const SaHpiSensorRecT &sensor = Rdr->RdrTypeUnion.SensorRec;
    if (kviCsRawEnum(sensor.EventCtrl) == SAHPI_SEC_NO_EVENTS) {
        KVI_DLOG(KVI_LOG_DBG_H, "Sensor does not support events. None Saved");
        return SA_OK;
    }
    SaHpiCapabilitiesT capabilities = 0;
    SaErrorT rc = kviCsSensorCapabilities(DomainId, ResourceId, &capabilities);
    if (rc != SA_OK)
        return rc;
    SaHpiSensorEvtEnablesT enables;
    memset(&enables, 0, sizeof enables);
    rc = FnTable->SensorEventEnablesGet == nullptr
             ? SA_ERR_HPI_INVALID_CMD
             : FnTable->SensorEventEnablesGet(DomainId, ResourceId, sensor.Num, UserData,
                                              capabilities, sensor.Category, &enables);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsSensorEventEnablesGet failed. rc %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "Saving Event Enables in NV Mem.");
    rc = kviCsSaveEvtEnablesNV(DomainId, ResourceId, sensor.Num, SAHPI_FALSE, &enables);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsSaveEvtEnablesNV failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT restoreThresholds(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                           SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                           void *UserData) noexcept
{
    const SaHpiSensorRecT &sensor = Rdr->RdrTypeUnion.SensorRec;
    if (!sensor.ThresholdDefn.IsThreshold)
        return SA_OK;
    KVI_DLOG(KVI_LOG_DBG_L, "Sensor supports thresholds %d", sensor.ThresholdDefn.IsThreshold);
    SaHpiSensorThresholdsT thresholds;
    bool found = false;
    SaErrorT rc = kviCsRestoreReadResult(
        kviCsGetThreshNV(DomainId, ResourceId, sensor.Num, IsDaemonRestore, &thresholds),
        IsDaemonRestore, THRESHOLD_TEXTS, &found);
    if (rc != SA_OK || !found)
        return rc;
    return kviCsApplySensorThresholds(DomainId, ResourceId, Rdr, FnTable, UserData, &thresholds);
}

// The enables are always read from the explicit save's copy, even in a
// daemon restore, while the thresholds follow IsDaemonRestore.
SaErrorT restoreEventEnables(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                             SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                             void *UserData) noexcept
{
    const SaHpiSensorRecT &sensor = Rdr->RdrTypeUnion.SensorRec;
    if (kviCsRawEnum(sensor.EventCtrl) == SAHPI_SEC_NO_EVENTS)
        return SA_OK;
    KVI_DLOG(KVI_LOG_DBG_L, "Sensor supports events %d", kviCsRawEnum(sensor.EventCtrl));
    SaHpiSensorEvtEnablesT enables;
    bool found = false;
    SaErrorT rc = kviCsRestoreReadResult(
        kviCsGetEvtEnablesNV(DomainId, ResourceId, sensor.Num, SAHPI_FALSE, &enables),
        IsDaemonRestore, EVENT_ENABLE_TEXTS, &found);
    if (rc != SA_OK || !found)
        return rc;
    return kviCsApplySensorEventEnables(DomainId, ResourceId, Rdr, FnTable, UserData, &enables);
}

} // namespace

// ---------------------------------------------------------------------------

KVI_EXPORT SaErrorT kviCsParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiParmActionT Action, KviDsRptFnTable *FnTable,
                                     void *UserDefined) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, action=%d", DomainId, ResourceId, kviCsRawEnum(Action));
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(UserDefined);
    if (!validAction(kviCsRawEnum(Action))) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Parm Action %d", kviCsRawEnum(Action));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    const RptActionTextsT &texts = RPT_ACTION_TEXTS[Action];
    KVI_DLOG(KVI_LOG_DBG_H, "%s", texts.Doing);
    SaErrorT rc = SA_OK;
    if (!callRptSlot(DomainId, ResourceId, Action, FnTable, UserDefined, &rc)) {
        KVI_DLOG(KVI_LOG_DBG_L, "%s", texts.NoSlot);
    } else if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, texts.Failed, rc, ResourceId);
        return rc;
    }
    rc = kviCsRdrPerformParmAction(DomainId, ResourceId, Action);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRdrPerformParmAction failed. rc=%d, rid=%u", rc,
                 ResourceId);
    return rc;
}

KVI_EXPORT SaErrorT kviCsRptSaveParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            KviDsRptFnTable *FnTable, void *UserDefined) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    KVI_NULL_CHECK(FnTable);
    SaHpiRptEntryT entry;
    SaErrorT rc = kviCsRptActiveEntryGetByRid(DomainId, ResourceId, &entry, nullptr, nullptr,
                                              nullptr, nullptr);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRptActiveEntryGetByRid failed. rc=%d", rc);
        return rc;
    }
    rc = saveEventLogState(DomainId, ResourceId, FnTable, UserDefined);
    if (rc != SA_OK)
        return rc;
    rc = kviCsSaveResTagNV(DomainId, ResourceId, SAHPI_FALSE, &entry.ResourceTag);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSaveResTagNV failed. rc=%d", rc);
        return rc;
    }
    rc = kviCsSaveResSeverityNV(DomainId, ResourceId, SAHPI_FALSE, &entry.ResourceSeverity);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSaveResSeverityNV failed. rc=%d", rc);
        return rc;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptRestoreParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                               KviDsRptFnTable *FnTable, void *UserDefined,
                                               SaHpiBoolT DaemonRestore) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, daemon=%d", DomainId, ResourceId, DaemonRestore);
    KVI_NULL_CHECK(FnTable);
    SaErrorT rc = restoreTag(DomainId, ResourceId, DaemonRestore);
    if (rc == SA_OK)
        rc = restoreSeverity(DomainId, ResourceId, DaemonRestore);
    if (rc == SA_OK)
        rc = restoreEventLogState(DomainId, ResourceId, FnTable, UserDefined, DaemonRestore);
    return rc;
}

KVI_EXPORT SaErrorT kviCsRdrPerformParmAction(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                              SaHpiParmActionT Action) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, action=%d", DomainId, ResourceId, kviCsRawEnum(Action));
    RawActionT action = kviCsRawEnum(Action);
    return kviCsRdrWalk(DomainId, ResourceId, "Rdr is not active", performOnRecord, &action);
}

KVI_EXPORT SaErrorT kviCsRdrSaveSensorParmControl(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                                                  KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(UserData);
    SaErrorT rc = saveThresholds(DomainId, ResourceId, Rdr, FnTable, UserData);
    if (rc != SA_OK)
        return rc;
    return saveEventEnables(DomainId, ResourceId, Rdr, FnTable, UserData);
}

KVI_EXPORT SaErrorT kviCsRdrRestoreSensor(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                          SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
                                          KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, daemon=%d", DomainId, ResourceId, IsDaemonRestore);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(UserData);
    SaErrorT rc = restoreThresholds(DomainId, ResourceId, IsDaemonRestore, Rdr, FnTable, UserData);
    if (rc != SA_OK)
        return rc;
    return restoreEventEnables(DomainId, ResourceId, IsDaemonRestore, Rdr, FnTable, UserData);
}

// ---------------------------------------------------------------------------
// Applying saved sensor settings, shared with the daemon restore

SaErrorT kviCsApplySensorThresholds(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData,
                                    SaHpiSensorThresholdsT *Thresholds) noexcept
{
    const SaHpiSensorRecT &sensor = Rdr->RdrTypeUnion.SensorRec;
    for (const WritableThresholdT &threshold : WRITABLE_THRESHOLDS)
        if ((sensor.ThresholdDefn.WriteThold & threshold.Mask) == 0)
            memset(&(Thresholds->*threshold.Field), 0, sizeof(SaHpiSensorReadingT));
    if (FnTable->SensorThresholdsSet == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "SensorThresholdsSet is NULL.");
        return SA_ERR_HPI_ERROR;
    }
    SaErrorT rc =
        FnTable->SensorThresholdsSet(DomainId, ResourceId, sensor.Num, Rdr, Thresholds, UserData);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to restore Sensor Thresholds returned %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsApplySensorEventEnables(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData,
                                      SaHpiSensorEvtEnablesT *Enables) noexcept
{
    SaHpiCapabilitiesT capabilities = 0;
    SaErrorT rc = kviCsSensorCapabilities(DomainId, ResourceId, &capabilities);
    if (rc != SA_OK)
        return rc;
    if (FnTable->SensorEventEnablesSet == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "SensorEventEnablesSet is NULL.");
        return SA_ERR_HPI_ERROR;
    }
    rc = FnTable->SensorEventEnablesSet(DomainId, ResourceId, Rdr->RdrTypeUnion.SensorRec.Num,
                                        Enables, Rdr, capabilities, UserData);
    if (rc != SA_OK) {
        // Logged as fatal, as it always was, though the daemon carries on.
        KVI_FLOG(KVI_LOG_ERR_FATAL, "kviIsSensorEventEnablesSet failed. rc=%d\n", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}
