// Resource-wide state: power, reset and the hot-swap slots. The library
// serves power and reset calls; the hot-swap slots are reserved by it, and
// the simulator still keeps them stateful so that a later front end finds a
// plug-in that answers them.
#include "SimModel.h"

namespace
{

constexpr SaHpiTimeoutT AUTO_EXTRACT_TIMEOUT = 5000000000LL; // 5 s

SimResourceT *resourceOf(void *UserDefined) noexcept
{
    return static_cast<SimResourceT *>(UserDefined);
}

} // namespace

// ---- Model ----

SaHpiBoolT simIsRunning(const SimResourceT *Resource) noexcept
{
    if (Resource->PowerState != SAHPI_HS_POWER_ON || Resource->ResetAsserted) {
        return SAHPI_FALSE;
    }
    const SimRecordT *inhibit = simFindControl(Resource, SIM_CTRL_POWER_INHIBIT);
    return inhibit != nullptr && inhibit->Control.State.StateUnion.Digital == SAHPI_CTRL_STATE_ON
               ? SAHPI_FALSE
               : SAHPI_TRUE;
}

void simResourceInitialize(SimResourceT *Resource) noexcept
{
    Resource->PowerState = SAHPI_HS_POWER_ON;
    Resource->ResetAsserted = SAHPI_FALSE;
    Resource->HotSwap.State = SAHPI_HS_STATE_ACTIVE_HEALTHY;
    Resource->HotSwap.Managed = SAHPI_FALSE;
    Resource->Log.NextId = 1;
    Resource->Log.UpdateTimestamp = SAHPI_TIME_UNSPECIFIED;
    simResourceDefaults(Resource);
}

void simResourceDefaults(SimResourceT *Resource) noexcept
{
    Resource->Log.Enabled = SAHPI_TRUE;
    Resource->Log.Offset = 0;
    Resource->HotSwap.AutoExtractTimeout = AUTO_EXTRACT_TIMEOUT;
    Resource->HotSwap.Indicator = SAHPI_HS_INDICATOR_OFF;
}

// ---- Power and reset ----

SaErrorT simResourcePowerStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                  SaHpiHsPowerStateT *State) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || State == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *State = resource->PowerState;
    return SA_OK;
}

SaErrorT simResourcePowerStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsPowerStateT State,
                                  void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    switch (simRaw(State)) {
    case SAHPI_HS_POWER_OFF:
    case SAHPI_HS_POWER_ON:
        resource->PowerState = State;
        break;
    case SAHPI_HS_POWER_CYCLE:
        // Off and on again: the resource ends up powered.
        resource->PowerCycles++;
        resource->PowerState = SAHPI_HS_POWER_ON;
        break;
    default:
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (resource->PowerState == SAHPI_HS_POWER_OFF) {
        for (SaHpiUint32T i = 0; i < resource->RecordCount; i++) {
            if (resource->Records[i].Type == SAHPI_WATCHDOG_RDR) {
                simWatchdogStop(&resource->Records[i]);
            }
        }
    }
    simSensorsEvaluate(resource);
    return SA_OK;
}

SaErrorT simResourceResetStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                  SaHpiResetActionT *ResetAction) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || ResetAction == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *ResetAction = resource->ResetAsserted ? SAHPI_RESET_ASSERT : SAHPI_RESET_DEASSERT;
    return SA_OK;
}

SaErrorT simResourceResetStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiResetActionT ResetAction,
                                  void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    switch (simRaw(ResetAction)) {
    case SAHPI_COLD_RESET:
    case SAHPI_WARM_RESET:
        // A resource held in reset has to be let go first.
        if (resource->ResetAsserted) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        resource->ResetCount++;
        break;
    case SAHPI_RESET_ASSERT:
        resource->ResetAsserted = SAHPI_TRUE;
        break;
    case SAHPI_RESET_DEASSERT:
        resource->ResetAsserted = SAHPI_FALSE;
        break;
    default:
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    // A reset stops the resource's watchdogs, as on real boards.
    if (simRaw(ResetAction) != SAHPI_RESET_DEASSERT) {
        for (SaHpiUint32T i = 0; i < resource->RecordCount; i++) {
            if (resource->Records[i].Type == SAHPI_WATCHDOG_RDR) {
                simWatchdogStop(&resource->Records[i]);
            }
        }
    }
    simSensorsEvaluate(resource);
    return SA_OK;
}

// ---- Hot swap ----
//
// A resource is active until a client asks for its extraction; with hot-swap
// control taken by the client the pending states wait for ResourceActiveSet
// or ResourceInactiveSet, otherwise they complete at once.

SaErrorT simHotSwapControlRequest(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    resource->HotSwap.Managed = SAHPI_TRUE;
    return SA_OK;
}

SaErrorT simResourceActiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    SimHotSwapT &hs = resource->HotSwap;
    if (!hs.Managed || (hs.State != SAHPI_HS_STATE_INSERTION_PENDING &&
                        hs.State != SAHPI_HS_STATE_EXTRACTION_PENDING)) {
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    hs.State = SAHPI_HS_STATE_ACTIVE_HEALTHY;
    return SA_OK;
}

SaErrorT simResourceInactiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    SimHotSwapT &hs = resource->HotSwap;
    if (!hs.Managed || (hs.State != SAHPI_HS_STATE_INSERTION_PENDING &&
                        hs.State != SAHPI_HS_STATE_EXTRACTION_PENDING)) {
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    hs.State = SAHPI_HS_STATE_INACTIVE;
    return SA_OK;
}

SaErrorT simAutoExtractTimeoutGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                  SaHpiTimeoutT *Timeout) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || Timeout == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *Timeout = resource->HotSwap.AutoExtractTimeout;
    return SA_OK;
}

SaErrorT simAutoExtractTimeoutSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiTimeoutT Timeout,
                                  void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || (Timeout < 0 && Timeout != SAHPI_TIMEOUT_BLOCK)) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    resource->HotSwap.AutoExtractTimeout = Timeout;
    return SA_OK;
}

SaErrorT simHotSwapStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                            SaHpiHsStateT *State) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || State == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *State = resource->HotSwap.State;
    return SA_OK;
}

SaErrorT simHotSwapActionRequest(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsActionT Action,
                                 void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    SimHotSwapT &hs = resource->HotSwap;
    switch (simRaw(Action)) {
    case SAHPI_HS_ACTION_INSERTION:
        if (hs.State != SAHPI_HS_STATE_INACTIVE) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        hs.State = hs.Managed ? SAHPI_HS_STATE_INSERTION_PENDING : SAHPI_HS_STATE_ACTIVE_HEALTHY;
        return SA_OK;
    case SAHPI_HS_ACTION_EXTRACTION:
        if (hs.State != SAHPI_HS_STATE_ACTIVE_HEALTHY &&
            hs.State != SAHPI_HS_STATE_ACTIVE_UNHEALTHY) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        hs.State = hs.Managed ? SAHPI_HS_STATE_EXTRACTION_PENDING : SAHPI_HS_STATE_INACTIVE;
        return SA_OK;
    default:
        return SA_ERR_HPI_INVALID_PARAMS;
    }
}

SaErrorT simHotSwapIndicatorStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                     SaHpiHsIndicatorStateT *State) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr || State == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    *State = resource->HotSwap.Indicator;
    return SA_OK;
}

SaErrorT simHotSwapIndicatorStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsIndicatorStateT State,
                                     void *UserDefined) noexcept
{
    SimResourceT *resource = resourceOf(UserDefined);
    if (resource == nullptr ||
        (simRaw(State) != SAHPI_HS_INDICATOR_OFF && simRaw(State) != SAHPI_HS_INDICATOR_ON)) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    resource->HotSwap.Indicator = State;
    return SA_OK;
}
