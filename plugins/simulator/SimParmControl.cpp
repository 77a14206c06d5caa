// Parameter control: default, save and restore of a resource's settings and
// of each record's. Saved settings are kept in memory only, so they last as
// long as the plug-in stays loaded.
#include "SimModel.h"

namespace
{

SaErrorT recordParm(SimRecordT *Record, SimParmT Action) noexcept
{
    switch (Record->Type) {
    case SAHPI_SENSOR_RDR:
        return simSensorParm(Record, Action);
    case SAHPI_CTRL_RDR:
        return simControlParm(Record, Action);
    case SAHPI_INVENTORY_RDR:
        return simInventoryParm(Record, Action);
    case SAHPI_WATCHDOG_RDR:
        return simWatchdogParm(Record, Action);
    default:
        return SA_ERR_HPI_INVALID_PARAMS;
    }
}

SaErrorT recordSlot(void *UserData, SimParmT Action, SaHpiBoolT IsDaemonRestore) noexcept
{
    auto *record = static_cast<SimRecordT *>(UserData);
    if (record == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(record->Resource);
    if (record->Removed) {
        return SA_ERR_HPI_NOT_PRESENT;
    }
    SaErrorT rc = recordParm(record, Action);
    // At daemon start nothing may have been saved yet, and that is no error.
    if (rc == SA_ERR_HPI_INVALID_REQUEST && IsDaemonRestore) {
        return SA_OK;
    }
    return rc;
}

} // namespace

// ---- Resource level: the event-log state and the hot-swap settings ----

SaErrorT simRptDefaultParmControl(SaHpiDomainIdT, SaHpiResourceIdT ResourceId) noexcept
{
    SimResourceT *resource = simFindResource(ResourceId);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_RESOURCE;
    }
    SimLock lock(resource);
    simResourceDefaults(resource);
    return SA_OK;
}

SaErrorT simRptSaveParmControl(SaHpiDomainIdT, SaHpiResourceIdT, KviDsRptFnTable *,
                               void *UserDefined) noexcept
{
    auto *resource = static_cast<SimResourceT *>(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    resource->SavedParms.LogEnabled = resource->Log.Enabled;
    resource->SavedParms.AutoExtractTimeout = resource->HotSwap.AutoExtractTimeout;
    resource->SavedParms.Indicator = resource->HotSwap.Indicator;
    resource->HasSavedParms = SAHPI_TRUE;
    return SA_OK;
}

SaErrorT simRptRestoreParmControl(SaHpiDomainIdT, SaHpiResourceIdT, KviDsRptFnTable *,
                                  void *UserDefined, SaHpiBoolT IsDaemonRestore) noexcept
{
    auto *resource = static_cast<SimResourceT *>(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    if (!resource->HasSavedParms) {
        return IsDaemonRestore ? SA_OK : SA_ERR_HPI_INVALID_REQUEST;
    }
    resource->Log.Enabled = resource->SavedParms.LogEnabled;
    resource->HotSwap.AutoExtractTimeout = resource->SavedParms.AutoExtractTimeout;
    resource->HotSwap.Indicator = resource->SavedParms.Indicator;
    return SA_OK;
}

// ---- Record level ----

SaErrorT simRdrDefaultParmControl(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *, KviDsRdrFnTable *,
                                  void *UserData) noexcept
{
    return recordSlot(UserData, SIM_PARM_DEFAULT, SAHPI_FALSE);
}

SaErrorT simRdrSaveParmControl(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *, KviDsRdrFnTable *,
                               void *UserData) noexcept
{
    return recordSlot(UserData, SIM_PARM_SAVE, SAHPI_FALSE);
}

SaErrorT simRdrRestoreParmControl(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiBoolT IsDaemonRestore,
                                  SaHpiRdrT *, KviDsRdrFnTable *, void *UserData) noexcept
{
    return recordSlot(UserData, SIM_PARM_RESTORE, IsDaemonRestore);
}
