// The restore at daemon start: every setting that a client changed through
// the HPI calls before the restart (resource tags and severities, sensor
// thresholds and event enables, control states) was saved by the library
// under a flag-1 key; after the plug-ins have discovered their resources the
// daemon puts those values back. A setting never changed has no key and
// keeps whatever the plug-in reported.
#include "core/SaHpi/parmControl/ParmControlHelpers.h"

#include "core/SaHpi/domain/Domain.h"

namespace
{

// Only the flag-1 copy is read, and a missing key is never an error, so the
// texts for an explicit restore are not needed.
constexpr KviRestoreTextsT THRESHOLD_TEXTS = {"", SA_OK, "Failed to get sensor thresholds from NV",
                                              false};
constexpr KviRestoreTextsT EVENT_ENABLE_TEXTS = {"", SA_OK, "Failed to get sensor events from NV",
                                                 false};
constexpr KviRestoreTextsT CTRL_STATE_TEXTS = {"", SA_OK, "Failed to get control state from NV",
                                               false};

// Puts back the daemon's copy of one record setting, if there is one: Get
// reads it, Apply writes it through the record's table.
template <typename T>
SaErrorT restoreDaemonCopy(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiUint8T Num,
                           SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData,
                           SaErrorT (*Get)(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiUint8T,
                                           SaHpiBoolT, T *),
                           const KviRestoreTextsT &Texts, const char *Restoring,
                           SaErrorT (*Apply)(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *,
                                             KviDsRdrFnTable *, void *, T *)) noexcept
{
    T value;
    bool found = false;
    SaErrorT rc = kviCsRestoreReadResult(Get(DomainId, ResourceId, Num, SAHPI_TRUE, &value),
                                         SAHPI_TRUE, Texts, &found);
    if (rc != SA_OK || !found)
        return rc;
    KVI_DLOG(KVI_LOG_DBG_L, "%s", Restoring);
    return Apply(DomainId, ResourceId, Rdr, FnTable, UserData, &value);
}

// A set slot that is empty fails the restore.
SaErrorT applyCtrlState(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                        KviDsRdrFnTable *FnTable, void *UserData, SaHpiCtrlStateT *State) noexcept
{
    return kviCsApplyCtrlState(DomainId, ResourceId, Rdr, FnTable, UserData, State,
                               SA_ERR_HPI_ERROR);
}

SaErrorT restoreSensor(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                       KviRdrVisitT *Record) noexcept
{
    const SaHpiSensorRecT &sensor = Record->Rdr.RdrTypeUnion.SensorRec;
    SaErrorT rc = SA_OK;
    if (sensor.ThresholdDefn.IsThreshold &&
        (rc = kviCsDeamonRestoreSensorThresh(DomainId, ResourceId, sensor.Num, &Record->Rdr,
                                             &Record->FnTable, Record->UserData)) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsDeamonRestoreSensorThresh Failed. rc %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    if (kviCsRawEnum(sensor.EventCtrl) != SAHPI_SEC_NO_EVENTS &&
        (rc = kviCsDeamonRestoreEventEnables(DomainId, ResourceId, sensor.Num, &Record->Rdr,
                                             &Record->FnTable, Record->UserData)) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsDeamonRestoreEventEnables Failed. rc %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT restoreControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                        KviRdrVisitT *Record) noexcept
{
    const SaHpiCtrlRecT &ctrl = Record->Rdr.RdrTypeUnion.CtrlRec;
    if (ctrl.Ignore)
        return SA_OK;
    SaErrorT rc = kviCsDeamonRestoreCtrlState(DomainId, ResourceId, ctrl.Num, &Record->Rdr,
                                              &Record->FnTable, Record->UserData);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsDeamonRestoreCtrlState Failed. rc %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT restoreRecord(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, KviRdrVisitT *Record,
                       void *) noexcept
{
    switch (Record->Rdr.RdrType) {
    case SAHPI_SENSOR_RDR:
        return restoreSensor(DomainId, ResourceId, Record);
    case SAHPI_CTRL_RDR:
        return restoreControl(DomainId, ResourceId, Record);
    default:
        KVI_DLOG(KVI_LOG_DBG_L, "Ignoring Rdr. Type %d", Record->Rdr.RdrType);
        return SA_OK;
    }
}

// The domain's own setting comes back before its resources. A value the
// store holds but the domain refuses (a damaged object) keeps the default.
void restoreAutoInsertTimeout(SaHpiDomainIdT DomainId) noexcept
{
    SaHpiTimeoutT timeout = 0;
    SaErrorT rc = kviCsGetAutoInsertTimeoutNV(DomainId, SAHPI_TRUE, &timeout);
    if (rc == SA_ERR_HPI_NOT_PRESENT) {
        KVI_DLOG(KVI_LOG_DBG_L, "auto-insert timeout was not saved. cannot restore");
        return;
    }
    if (rc == SA_OK)
        rc = kviCsAutoInsertTimeoutSet(DomainId, timeout);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to restore the auto-insert timeout. rc=%d", rc);
}

} // namespace

KVI_EXPORT SaErrorT kviCsDaemonRestoreDomain(SaHpiDomainIdT DomainId) noexcept
{
    KVI_TRACE("domain=%u", DomainId);
    restoreAutoInsertTimeout(DomainId);
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    do {
        SaHpiRptEntryT rptEntry;
        SaHpiEntryIdT next = SAHPI_LAST_ENTRY;
        SaErrorT rc = kviCsRptActiveEntryGet(DomainId, entry, &next, &rptEntry, nullptr);
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRptActiveEntryGet returned %d", rc);
            return SA_ERR_HPI_ERROR;
        }
        KVI_DLOG(KVI_LOG_DBG_L, "Calling kviIsParmControlDeamonRestore Dom %d, ResId %d\n",
                 DomainId, rptEntry.ResourceId);
        rc = kviCsParmControlDeamonRestore(DomainId, rptEntry.ResourceId);
        if (rc != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsParmControlDeamonRestore returned %d", rc);
        entry = next;
    } while (entry != SAHPI_LAST_ENTRY);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsParmControlDeamonRestore(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    SaErrorT rc = kviCsDeamonRestoreResourceTag(DomainId, ResourceId);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsDeamonRestoreResourceTag failed. rc=%d\n", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = kviCsDeamonRestoreResourceSeverity(DomainId, ResourceId);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsDeamonRestoreResourceSeverity failed. rc=%d\n", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = kviCsRdrWalk(DomainId, ResourceId, "Rdr is not active=", restoreRecord, nullptr);
    return rc == SA_OK ? SA_OK : SA_ERR_HPI_ERROR;
}

KVI_EXPORT SaErrorT kviCsDeamonRestoreResourceTag(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    char key[KVI_MAX_NV_KEY_LENGTH];
    KVI_CREATE_NV_PARMCTRL_KEY_RPT(key, KVI_NVKEY_RESOURCE_TAG_PREFIX, SAHPI_TRUE, DomainId,
                                   ResourceId);
    KVI_DLOG(KVI_LOG_DBG_L, "Getting resource tag from Non-Vol. memory");
    SaHpiTextBufferT tag;
    SaErrorT rc = kviCsReadResTagNV(key, false, KVI_LOG_ERR_FATAL_NUM, &tag);
    if (rc == SA_ERR_HPI_NOT_PRESENT) {
        KVI_DLOG(KVI_LOG_DBG_L, "resource tag was not saved. cannot restore");
        return SA_OK;
    }
    if (rc != SA_OK)
        return SA_ERR_HPI_ERROR;
    KVI_DLOG(KVI_LOG_DBG_L, "Restoring resource tag.");
    if (kviCsRptEntryModifyTagByRid(DomainId, ResourceId, &tag) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to set resource tag");
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsDeamonRestoreResourceSeverity(SaHpiDomainIdT DomainId,
                                                       SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    KVI_DLOG(KVI_LOG_DBG_L, "Getting resource severity from Non-Vol. memory");
    SaHpiSeverityT severity = SAHPI_OK;
    SaErrorT rc = kviCsGetResSeverityNV(DomainId, ResourceId, SAHPI_TRUE, &severity);
    if (rc == SA_ERR_HPI_NOT_PRESENT) {
        KVI_DLOG(KVI_LOG_DBG_L, "resource severity was not saved. cannot restore");
        return SA_OK;
    }
    if (rc != SA_OK)
        return SA_ERR_HPI_ERROR;
    KVI_DLOG(KVI_LOG_DBG_L, "Restoring resource severity.");
    if (kviCsRptEntryModifySeverityByRid(DomainId, ResourceId, severity) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to set resource severity");
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsDeamonRestoreSensorThresh(SaHpiDomainIdT DomainId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                                   KviDsRdrFnTable *FnTable,
                                                   void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, sensor=%u", DomainId, ResourceId, SensorNum);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    return restoreDaemonCopy(DomainId, ResourceId, SensorNum, Rdr, FnTable, UserData,
                             kviCsGetThreshNV, THRESHOLD_TEXTS, "Restoring sensor thresholds.",
                             kviCsApplySensorThresholds);
}

KVI_EXPORT SaErrorT kviCsDeamonRestoreEventEnables(SaHpiDomainIdT DomainId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                                   KviDsRdrFnTable *FnTable,
                                                   void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, sensor=%u", DomainId, ResourceId, SensorNum);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    return restoreDaemonCopy(DomainId, ResourceId, SensorNum, Rdr, FnTable, UserData,
                             kviCsGetEvtEnablesNV, EVENT_ENABLE_TEXTS,
                             "Restoring sensor event enables.", kviCsApplySensorEventEnables);
}

KVI_EXPORT SaErrorT kviCsDeamonRestoreCtrlState(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId, SaHpiCtrlNumT CtrlNum,
                                                SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                                                void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, control=%u", DomainId, ResourceId, CtrlNum);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    return restoreDaemonCopy(DomainId, ResourceId, CtrlNum, Rdr, FnTable, UserData,
                             kviCsGetCtrlStateNV, CTRL_STATE_TEXTS, "Restoring control state.",
                             applyCtrlState);
}
