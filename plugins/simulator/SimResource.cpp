// Resource-wide state: power, reset and the hot-swap slots. The library
// serves power and reset calls; the hot-swap slots are reserved by it, and
// the simulator still keeps them stateful so that a later front end finds a
// plug-in that answers them.
#include "SimModel.h"

namespace
{

constexpr SaHpiTimeoutT AUTO_EXTRACT_TIMEOUT = 5000000000LL; // 5 s

void stopWatchdogs(SimResourceT &Resource) noexcept
{
    for (SaHpiUint32T i = 0; i < Resource.RecordCount; i++) {
        if (Resource.Records[i].Type == SAHPI_WATCHDOG_RDR) {
            simWatchdogStop(&Resource.Records[i]);
        }
    }
}

// A client managing hot swap completes a pending insertion or extraction.
// Hot-swap state changes post no events yet: when they do, each change here
// and in simHotSwapActionRequest goes to simPublishEvent as a SAHPI_ET_HOTSWAP
// event with the previous state.
SaErrorT completePending(void *UserDefined, SaHpiHsStateT Target) noexcept
{
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        SimHotSwapT &hs = R.HotSwap;
        if (!hs.Managed || (hs.State != SAHPI_HS_STATE_INSERTION_PENDING &&
                            hs.State != SAHPI_HS_STATE_EXTRACTION_PENDING)) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        hs.State = Target;
        return SA_OK;
    });
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
    return simReadResource(UserDefined, State, [](const SimResourceT &R) { return R.PowerState; });
}

SaErrorT simResourcePowerStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsPowerStateT State,
                                  void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        switch (simRaw(State)) {
        case SAHPI_HS_POWER_OFF:
        case SAHPI_HS_POWER_ON:
            R.PowerState = State;
            break;
        case SAHPI_HS_POWER_CYCLE:
            // Off and on again: the resource ends up powered.
            R.PowerCycles++;
            R.PowerState = SAHPI_HS_POWER_ON;
            break;
        default:
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        if (R.PowerState == SAHPI_HS_POWER_OFF) {
            stopWatchdogs(R);
        }
        simSensorsEvaluate(&R);
        return SA_OK;
    });
}

SaErrorT simResourceResetStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                  SaHpiResetActionT *ResetAction) noexcept
{
    return simReadResource(UserDefined, ResetAction, [](const SimResourceT &R) {
        return R.ResetAsserted ? SAHPI_RESET_ASSERT : SAHPI_RESET_DEASSERT;
    });
}

SaErrorT simResourceResetStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiResetActionT ResetAction,
                                  void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        switch (simRaw(ResetAction)) {
        case SAHPI_COLD_RESET:
        case SAHPI_WARM_RESET:
            // A resource held in reset has to be let go first.
            if (R.ResetAsserted) {
                return SA_ERR_HPI_INVALID_REQUEST;
            }
            R.ResetCount++;
            break;
        case SAHPI_RESET_ASSERT:
            R.ResetAsserted = SAHPI_TRUE;
            break;
        case SAHPI_RESET_DEASSERT:
            R.ResetAsserted = SAHPI_FALSE;
            break;
        default:
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        // A reset stops the resource's watchdogs, as on real boards.
        if (simRaw(ResetAction) != SAHPI_RESET_DEASSERT) {
            stopWatchdogs(R);
        }
        simSensorsEvaluate(&R);
        return SA_OK;
    });
}

// ---- Hot swap ----
//
// A resource is active until a client asks for its extraction; with hot-swap
// control taken by the client the pending states wait for ResourceActiveSet
// or ResourceInactiveSet, otherwise they complete at once.

SaErrorT simHotSwapControlRequest(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [](SimResourceT &R) {
        R.HotSwap.Managed = SAHPI_TRUE;
        return SA_OK;
    });
}

SaErrorT simResourceActiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return completePending(UserDefined, SAHPI_HS_STATE_ACTIVE_HEALTHY);
}

SaErrorT simResourceInactiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return completePending(UserDefined, SAHPI_HS_STATE_INACTIVE);
}

SaErrorT simAutoExtractTimeoutGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                  SaHpiTimeoutT *Timeout) noexcept
{
    return simReadResource(UserDefined, Timeout,
                           [](const SimResourceT &R) { return R.HotSwap.AutoExtractTimeout; });
}

SaErrorT simAutoExtractTimeoutSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiTimeoutT Timeout,
                                  void *UserDefined) noexcept
{
    if (Timeout < 0 && Timeout != SAHPI_TIMEOUT_BLOCK) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        R.HotSwap.AutoExtractTimeout = Timeout;
        return SA_OK;
    });
}

SaErrorT simHotSwapStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                            SaHpiHsStateT *State) noexcept
{
    return simReadResource(UserDefined, State,
                           [](const SimResourceT &R) { return R.HotSwap.State; });
}

SaErrorT simHotSwapActionRequest(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsActionT Action,
                                 void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        SimHotSwapT &hs = R.HotSwap;
        switch (simRaw(Action)) {
        case SAHPI_HS_ACTION_INSERTION:
            if (hs.State != SAHPI_HS_STATE_INACTIVE) {
                return SA_ERR_HPI_INVALID_REQUEST;
            }
            hs.State =
                hs.Managed ? SAHPI_HS_STATE_INSERTION_PENDING : SAHPI_HS_STATE_ACTIVE_HEALTHY;
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
    });
}

SaErrorT simHotSwapIndicatorStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                     SaHpiHsIndicatorStateT *State) noexcept
{
    return simReadResource(UserDefined, State,
                           [](const SimResourceT &R) { return R.HotSwap.Indicator; });
}

SaErrorT simHotSwapIndicatorStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsIndicatorStateT State,
                                     void *UserDefined) noexcept
{
    if (simRaw(State) != SAHPI_HS_INDICATOR_OFF && simRaw(State) != SAHPI_HS_INDICATOR_ON) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        R.HotSwap.Indicator = State;
        return SA_OK;
    });
}
