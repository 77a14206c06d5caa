/* A plug-in written in plain C against the library's one public header.
 *
 * Every slot of both function tables is filled with a function of exactly
 * the slot's type, so the build breaks as soon as a table and the contract
 * drift apart. On discovery it registers one resource, with one record of
 * each kind, the way a hardware plug-in does: inactive first, records added,
 * then made visible. Everything it hangs on the resource and its records is
 * one block from the library's allocator, given back by the library's
 * default removal functions. */
#include <string.h>

#include "KviDaemonCore.h"

/* The slots here serve nothing and so ignore most of what they are given. */
#pragma GCC diagnostic ignored "-Wunused-parameter"

#define C_PLUGIN_TAG "C plug-in"

static SaHpiUint32T maplNum;
static SaHpiResourceIdT resourceId;

/* ---- Resource slots ---- */

static SaErrorT eventLogInfoGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                void *UserDefined, SaHpiSelInfoT *Info)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogEntryGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiSelEntryIdT EntryId, void *UserDefined,
                                 SaHpiSelEntryIdT *PrevEntryId, SaHpiSelEntryIdT *NextEntryId,
                                 SaHpiSelEntryT *EventLogEntry, SaHpiRdrT *Rdr,
                                 SaHpiRptEntryT *RptEntry)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogEntryAdd(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiSelEntryT *EvtEntry, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogEntryDelete(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiSelEntryIdT EntryId, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogClear(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                              void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogTimeGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                void *UserDefined, SaHpiTimeT *Time)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogTimeSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiTimeT Time, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 void *UserDefined, SaHpiBoolT *Enable)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT eventLogStateSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiBoolT Enable, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT hotSwapControlRequest(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT resourceActiveSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                  void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT resourceInactiveSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT autoExtractTimeoutGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiTimeoutT *Timeout)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT autoExtractTimeoutSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiTimeoutT Timeout, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT hotSwapStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                void *UserDefined, SaHpiHsStateT *State)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT hotSwapActionRequest(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiHsActionT Action, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT resourcePowerStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiHsPowerStateT *State)
{
    *State = SAHPI_HS_POWER_ON;
    return SA_OK;
}

static SaErrorT resourcePowerStateSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiHsPowerStateT State, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT hotSwapIndicatorStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         void *UserDefined, SaHpiHsIndicatorStateT *State)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT hotSwapIndicatorStateSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiHsIndicatorStateT State, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT resourceResetStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiResetActionT *ResetAction)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT resourceResetStateSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiResetActionT ResetAction, void *UserDefined)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT rptDefaultParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId)
{
    return SA_OK;
}

static SaErrorT rptSaveParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   KviDsRptFnTable *FnTable, void *UserDefined)
{
    return SA_OK;
}

static SaErrorT rptRestoreParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      KviDsRptFnTable *FnTable, void *UserDefined,
                                      SaHpiBoolT IsDaemonRestore)
{
    return SA_OK;
}

static KviDsRptFnTable rptTable = {
    eventLogInfoGet,
    eventLogEntryGet,
    eventLogEntryAdd,
    eventLogEntryDelete,
    eventLogClear,
    eventLogTimeGet,
    eventLogTimeSet,
    eventLogStateGet,
    eventLogStateSet,
    hotSwapControlRequest,
    resourceActiveSet,
    resourceInactiveSet,
    autoExtractTimeoutGet,
    autoExtractTimeoutSet,
    hotSwapStateGet,
    hotSwapActionRequest,
    resourcePowerStateGet,
    resourcePowerStateSet,
    hotSwapIndicatorStateGet,
    hotSwapIndicatorStateSet,
    resourceResetStateGet,
    resourceResetStateSet,
    kviDsDefaultRptResourcesRemove,
    rptDefaultParmControl,
    rptSaveParmControl,
    rptRestoreParmControl,
};

/* ---- Record slots ---- */

static SaErrorT sensorReadingGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiSensorNumT SensorNum, SaHpiEventCategoryT Category,
                                 SaHpiRdrT *Rdr, void *UserData, SaHpiSensorReadingT *Reading)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT sensorReadingConvert(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                     SaHpiSensorReadingT *ReadingInput, void *UserData,
                                     SaHpiSensorReadingT *ConvertedReading)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT sensorThresholdsGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr, void *UserData,
                                    SaHpiSensorThresholdsT *SensorThresholds)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT sensorThresholdsSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                    SaHpiSensorThresholdsT *SensorThresholds, void *UserData)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT sensorEventEnablesGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, void *UserData,
                                      SaHpiCapabilitiesT Capabilities, SaHpiEventCategoryT Category,
                                      SaHpiSensorEvtEnablesT *Enables)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT sensorEventEnablesSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, SaHpiSensorEvtEnablesT *Enables,
                                      SaHpiRdrT *Rdr, SaHpiCapabilitiesT Capabilities,
                                      void *UserData)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT controlStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiCtrlNumT CtrlNum, void *UserData, SaHpiCtrlStateT *CtrlState)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT controlStateSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiCtrlNumT CtrlNum, SaHpiCtrlStateT *CtrlState, void *UserData)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT watchdogTimerGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiWatchdogNumT WatchdogNum, void *UserData,
                                 SaHpiWatchdogT *Watchdog)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT watchdogTimerSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiWatchdogNumT WatchdogNum, SaHpiWatchdogT *Watchdog,
                                 void *UserData)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT watchdogTimerReset(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiWatchdogNumT WatchdogNum, void *UserData)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT entityInventoryDataRead(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiEirIdT EirId, SaHpiUint32T BufferSize, void *UserData,
                                        SaHpiInventoryDataT *InventData, SaHpiUint32T *ActualSize)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT entityInventoryDataWrite(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiEirIdT EirId, SaHpiInventoryDataT *InventData,
                                         void *UserData)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT activeAlarmTranslate(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiSensorNumT SensorNum, void *UserData, SaHpiRdrT *Rdr,
                                     SaHpiRptEntryT *RptEntry, SaHpiEventT *Event)
{
    return SA_ERR_HPI_INVALID_CMD;
}

static SaErrorT rdrDefaultParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData)
{
    return SA_OK;
}

static SaErrorT rdrSaveParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData)
{
    return SA_OK;
}

static SaErrorT rdrRestoreParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
                                      KviDsRdrFnTable *FnTable, void *UserData)
{
    return SA_OK;
}

/* One slot a line, in the contract's order. */
/* clang-format off */
static KviDsRdrFnTable rdrTable = {
    sensorReadingGet,
    sensorReadingConvert,
    sensorThresholdsGet,
    sensorThresholdsSet,
    sensorEventEnablesGet,
    sensorEventEnablesSet,
    controlStateGet,
    controlStateSet,
    watchdogTimerGet,
    watchdogTimerSet,
    watchdogTimerReset,
    entityInventoryDataRead,
    entityInventoryDataWrite,
    activeAlarmTranslate,
    kviDsDefaultRdrResourcesRemove,
    rdrDefaultParmControl,
    rdrSaveParmControl,
    rdrRestoreParmControl,
};
/* clang-format on */

/* ---- Initialisation table ---- */

static SaErrorT getVersion(SaHpiVersionT *Version)
{
    *Version = KVI_MAPL_INTR_VERSION;
    return SA_OK;
}

static SaErrorT maplInitialization(SaHpiUint32T MaplNum)
{
    maplNum = MaplNum;
    return SA_OK;
}

static SaErrorT maplFinalization(void)
{
    resourceId = 0;
    return SA_OK;
}

static SaErrorT addRecord(SaHpiDomainIdT DomainId, SaHpiRdrTypeT Type)
{
    SaHpiRdrT rdr;
    SaHpiEntryIdT recordId;
    KviCsRdrRecordNumT number;
    memset(&rdr, 0, sizeof rdr);
    rdr.RdrType = Type;
    void *user = KVI_CS_MALLOC(sizeof(SaHpiUint32T));
    SaErrorT rc = kviCsRdrAdd(DomainId, resourceId, &rdr, user, &rdrTable, &recordId, &number);
    if (rc != SA_OK) {
        KVI_CS_FREE(user);
        return rc;
    }
    if (Type == SAHPI_INVENTORY_RDR)
        rc = kviCsDefaultEirSet(DomainId, resourceId, number.EirNum);
    return rc;
}

static SaErrorT resourcesDiscover(SaHpiDomainIdT DomainId)
{
    static const SaHpiRdrTypeT kinds[] = {SAHPI_CTRL_RDR, SAHPI_SENSOR_RDR, SAHPI_INVENTORY_RDR,
                                          SAHPI_WATCHDOG_RDR};
    KviCsRwLockT *lock = NULL;
    SaHpiRptEntryT entry;
    SaErrorT rc = kviDsMaplManagerGetMaplLock(maplNum, 0, &lock);
    if (rc != SA_OK || resourceId != 0)
        return rc;
    memset(&entry, 0, sizeof entry);
    entry.ResourceCapabilities = SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_RDR |
                                 SAHPI_CAPABILITY_CONTROL | SAHPI_CAPABILITY_SENSOR |
                                 SAHPI_CAPABILITY_INVENTORY_DATA | SAHPI_CAPABILITY_WATCHDOG;
    entry.ResourceSeverity = SAHPI_OK;
    entry.ResourceTag.DataType = SAHPI_TL_TYPE_LANGUAGE;
    entry.ResourceTag.Language = SAHPI_LANG_ENGLISH;
    entry.ResourceTag.DataLength = (SaHpiUint8T)strlen(C_PLUGIN_TAG);
    memcpy(entry.ResourceTag.Data, C_PLUGIN_TAG, strlen(C_PLUGIN_TAG));
    void *user = KVI_CS_MALLOC(sizeof(SaHpiUint32T));
    rc =
        kviCsRptEntryAdd(DomainId, entry, user, SAHPI_FALSE, &rptTable, maplNum, lock, &resourceId);
    if (rc != SA_OK) {
        KVI_CS_FREE(user);
        resourceId = 0;
        return rc;
    }
    for (size_t i = 0; rc == SA_OK && i < sizeof kinds / sizeof kinds[0]; i++)
        rc = addRecord(DomainId, kinds[i]);
    if (rc == SA_OK)
        rc = kviCsRptEntryActiveStateSetByRid(DomainId, resourceId, SAHPI_TRUE);
    return rc;
}

KVI_EXPORT KviMaplInitTableT KviMaplInitTable = {
    getVersion,
    maplInitialization,
    maplFinalization,
    resourcesDiscover,
};
