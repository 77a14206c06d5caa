// Parameter control that is the simulator's own: the defaults of a resource,
// its sensors, inventory and watchdogs, and the saved settings of its
// watchdogs, which are kept in memory only and so last as long as the
// plug-in stays loaded. The library keeps everything else in its store.
#include "SimModel.h"

namespace
{

SaErrorT recordParm(SimRecordT *Record, SimParmT Action) noexcept
{
    if (Record->Type == SAHPI_WATCHDOG_RDR) {
        return simWatchdogParm(Record, Action);
    }
    if (Action != SIM_PARM_DEFAULT) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    switch (Record->Type) {
    case SAHPI_SENSOR_RDR:
        simSensorDefaults(Record);
        return SA_OK;
    case SAHPI_INVENTORY_RDR:
        simInventoryDefaults(Record);
        return SA_OK;
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
    return simWithRecord(record, record->Type, [&](SimRecordT &R) {
        SaErrorT rc = recordParm(&R, Action);
        // At daemon start nothing may have been saved yet, and that is no error.
        return rc == SA_ERR_HPI_INVALID_REQUEST && IsDaemonRestore ? SA_OK : rc;
    });
}

} // namespace

// The resource's own settings: the event-log state and the hot-swap ones.
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
