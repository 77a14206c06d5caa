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

/* A slot answering Result. Its parameters after the domain and resource ids
 * every slot starts with are written out in full, so the tables below only
 * compile while each slot keeps the contract's exact type. */
#define SLOT(Name, Result, ...)                                                                    \
    static SaErrorT Name(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, __VA_ARGS__)        \
    {                                                                                              \
        return Result;                                                                             \
    }
#define REFUSED SA_ERR_HPI_INVALID_CMD

static SaHpiUint32T maplNum;
static SaHpiResourceIdT resourceId;

/* ---- Resource slots ---- */

SLOT(eventLogInfoGet, REFUSED, void *UserDefined, SaHpiSelInfoT *Info)
SLOT(eventLogEntryGet, REFUSED, SaHpiSelEntryIdT EntryId, void *UserDefined,
     SaHpiSelEntryIdT *PrevEntryId, SaHpiSelEntryIdT *NextEntryId, SaHpiSelEntryT *EventLogEntry,
     SaHpiRdrT *Rdr, SaHpiRptEntryT *RptEntry)
SLOT(eventLogEntryAdd, REFUSED, SaHpiSelEntryT *EvtEntry, void *UserDefined)
SLOT(eventLogEntryDelete, REFUSED, SaHpiSelEntryIdT EntryId, void *UserDefined)
SLOT(eventLogClear, REFUSED, void *UserDefined)
SLOT(eventLogTimeGet, REFUSED, void *UserDefined, SaHpiTimeT *Time)
SLOT(eventLogTimeSet, REFUSED, SaHpiTimeT Time, void *UserDefined)
SLOT(eventLogStateGet, REFUSED, void *UserDefined, SaHpiBoolT *Enable)
SLOT(eventLogStateSet, REFUSED, SaHpiBoolT Enable, void *UserDefined)
SLOT(hotSwapControlRequest, REFUSED, void *UserDefined)
SLOT(resourceActiveSet, REFUSED, void *UserDefined)
SLOT(resourceInactiveSet, REFUSED, void *UserDefined)
SLOT(autoExtractTimeoutGet, REFUSED, void *UserDefined, SaHpiTimeoutT *Timeout)
SLOT(autoExtractTimeoutSet, REFUSED, SaHpiTimeoutT Timeout, void *UserDefined)
SLOT(hotSwapStateGet, REFUSED, void *UserDefined, SaHpiHsStateT *State)
SLOT(hotSwapActionRequest, REFUSED, SaHpiHsActionT Action, void *UserDefined)
SLOT(resourcePowerStateSet, REFUSED, SaHpiHsPowerStateT State, void *UserDefined)
SLOT(hotSwapIndicatorStateGet, REFUSED, void *UserDefined, SaHpiHsIndicatorStateT *State)
SLOT(hotSwapIndicatorStateSet, REFUSED, SaHpiHsIndicatorStateT State, void *UserDefined)
SLOT(resourceResetStateGet, REFUSED, void *UserDefined, SaHpiResetActionT *ResetAction)
SLOT(resourceResetStateSet, REFUSED, SaHpiResetActionT ResetAction, void *UserDefined)
SLOT(rptSaveParmControl, SA_OK, KviDsRptFnTable *FnTable, void *UserDefined)
SLOT(rptRestoreParmControl, SA_OK, KviDsRptFnTable *FnTable, void *UserDefined,
     SaHpiBoolT IsDaemonRestore)

static SaErrorT resourcePowerStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiHsPowerStateT *State)
{
    *State = SAHPI_HS_POWER_ON;
    return SA_OK;
}

static SaErrorT rptDefaultParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId)
{
    return SA_OK;
}

/* In the contract's order. */
/* clang-format off */
static KviDsRptFnTable rptTable = {
    eventLogInfoGet, eventLogEntryGet, eventLogEntryAdd, eventLogEntryDelete, eventLogClear,
    eventLogTimeGet, eventLogTimeSet, eventLogStateGet, eventLogStateSet, hotSwapControlRequest,
    resourceActiveSet, resourceInactiveSet, autoExtractTimeoutGet, autoExtractTimeoutSet,
    hotSwapStateGet, hotSwapActionRequest, resourcePowerStateGet, resourcePowerStateSet,
    hotSwapIndicatorStateGet, hotSwapIndicatorStateSet, resourceResetStateGet,
    resourceResetStateSet, kviDsDefaultRptResourcesRemove, rptDefaultParmControl,
    rptSaveParmControl, rptRestoreParmControl,
};
/* clang-format on */

/* ---- Record slots ---- */

SLOT(sensorReadingGet, REFUSED, SaHpiSensorNumT SensorNum, SaHpiEventCategoryT Category,
     SaHpiRdrT *Rdr, void *UserData, SaHpiSensorReadingT *Reading)
SLOT(sensorReadingConvert, REFUSED, SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
     SaHpiSensorReadingT *ReadingInput, void *UserData, SaHpiSensorReadingT *ConvertedReading)
SLOT(sensorThresholdsGet, REFUSED, SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr, void *UserData,
     SaHpiSensorThresholdsT *SensorThresholds)
SLOT(sensorThresholdsSet, REFUSED, SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
     SaHpiSensorThresholdsT *SensorThresholds, void *UserData)
SLOT(sensorEventEnablesGet, REFUSED, SaHpiSensorNumT SensorNum, void *UserData,
     SaHpiCapabilitiesT Capabilities, SaHpiEventCategoryT Category, SaHpiSensorEvtEnablesT *Enables)
SLOT(sensorEventEnablesSet, REFUSED, SaHpiSensorNumT SensorNum, SaHpiSensorEvtEnablesT *Enables,
     SaHpiRdrT *Rdr, SaHpiCapabilitiesT Capabilities, void *UserData)
SLOT(controlStateGet, REFUSED, SaHpiCtrlNumT CtrlNum, void *UserData, SaHpiCtrlStateT *CtrlState)
SLOT(controlStateSet, REFUSED, SaHpiCtrlNumT CtrlNum, SaHpiCtrlStateT *CtrlState, void *UserData)
SLOT(watchdogTimerGet, REFUSED, SaHpiWatchdogNumT WatchdogNum, void *UserData,
     SaHpiWatchdogT *Watchdog)
SLOT(watchdogTimerSet, REFUSED, SaHpiWatchdogNumT WatchdogNum, SaHpiWatchdogT *Watchdog,
     void *UserData)
SLOT(watchdogTimerReset, REFUSED, SaHpiWatchdogNumT WatchdogNum, void *UserData)
SLOT(entityInventoryDataRead, REFUSED, SaHpiEirIdT EirId, SaHpiUint32T BufferSize, void *UserData,
     SaHpiInventoryDataT *InventData, SaHpiUint32T *ActualSize)
SLOT(entityInventoryDataWrite, REFUSED, SaHpiEirIdT EirId, SaHpiInventoryDataT *InventData,
     void *UserData)
SLOT(activeAlarmTranslate, REFUSED, SaHpiSensorNumT SensorNum, void *UserData, SaHpiRdrT *Rdr,
     SaHpiRptEntryT *RptEntry, SaHpiEventT *Event)
SLOT(rdrDefaultParmControl, SA_OK, SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData)
SLOT(rdrSaveParmControl, SA_OK, SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData)
SLOT(rdrRestoreParmControl, SA_OK, SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
     KviDsRdrFnTable *FnTable, void *UserData)

/* clang-format off */
static KviDsRdrFnTable rdrTable = {
    sensorReadingGet, sensorReadingConvert, sensorThresholdsGet, sensorThresholdsSet,
    sensorEventEnablesGet, sensorEventEnablesSet, controlStateGet, controlStateSet,
    watchdogTimerGet, watchdogTimerSet, watchdogTimerReset, entityInventoryDataRead,
    entityInventoryDataWrite, activeAlarmTranslate, kviDsDefaultRdrResourcesRemove,
    rdrDefaultParmControl, rdrSaveParmControl, rdrRestoreParmControl,
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
