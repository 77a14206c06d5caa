// Resource-wide state: power, reset and hot swap.
#include <cstdint>

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

// ---- The hot-swap state machine ----
//
// A FRU's pending state runs its default policy when its countdown ends: the
// domain's auto-insert timeout or the resource's auto-extract timeout, as it
// stood when the state was entered. A client that takes control stops the
// countdown and decides with ResourceActiveSet or ResourceInactiveSet. The
// insertion policy powers the board and puts its indicator out; the
// extraction policy powers it off and lights the indicator, which tells the
// operator that the board may go. Every change posts a SAHPI_ET_HOTSWAP event.

bool isActive(SaHpiHsStateT State) noexcept
{
    return State == SAHPI_HS_STATE_ACTIVE_HEALTHY || State == SAHPI_HS_STATE_ACTIVE_UNHEALTHY;
}

bool isPending(SaHpiHsStateT State) noexcept
{
    return State == SAHPI_HS_STATE_INSERTION_PENDING || State == SAHPI_HS_STATE_EXTRACTION_PENDING;
}

// An active board that does not run (held in reset, powered off or
// inhibited by a client) is unhealthy.
SaHpiHsStateT activeState(const SimResourceT &R) noexcept
{
    return simIsRunning(&R) ? SAHPI_HS_STATE_ACTIVE_HEALTHY : SAHPI_HS_STATE_ACTIVE_UNHEALTHY;
}

void publishHotSwap(SimResourceT &R, SaHpiHsStateT Previous) noexcept
{
    SaHpiEventT event;
    memset(&event, 0, sizeof(event));
    event.Source = R.ResourceId;
    event.EventType = SAHPI_ET_HOTSWAP;
    event.Timestamp = simNow();
    event.Severity = R.Shape->Severity;
    event.EventDataUnion.HotSwapEvent.HotSwapState = R.HotSwap.State;
    event.EventDataUnion.HotSwapEvent.PreviousHotSwapState = Previous;
    simPublishEvent(&R, &event);
}

void enter(SimResourceT &R, SaHpiHsStateT State) noexcept;

void powerOff(SimResourceT &R) noexcept
{
    R.PowerState = SAHPI_HS_POWER_OFF;
    stopWatchdogs(R);
}

void activate(SimResourceT &R) noexcept
{
    R.PowerState = SAHPI_HS_POWER_ON;
    R.HotSwap.Indicator = SAHPI_HS_INDICATOR_OFF;
    R.HotSwap.Pulled = SAHPI_FALSE; // an extraction refused: the latch is closed again
    enter(R, activeState(R));
}

void deactivate(SimResourceT &R) noexcept
{
    powerOff(R);
    R.HotSwap.Indicator = SAHPI_HS_INDICATOR_ON;
    enter(R, SAHPI_HS_STATE_INACTIVE);
}

void runPolicy(SimResourceT &R) noexcept
{
    if (R.HotSwap.State == SAHPI_HS_STATE_INSERTION_PENDING) {
        activate(R);
    } else {
        deactivate(R);
    }
}

void startPolicy(SimResourceT &R) noexcept
{
    SimHotSwapT &hs = R.HotSwap;
    SaHpiTimeoutT timeout = hs.AutoExtractTimeout;
    if (hs.State == SAHPI_HS_STATE_INSERTION_PENDING &&
        kviCsAutoInsertTimeoutGet(R.DomainId, &timeout) != SA_OK) {
        timeout = SAHPI_TIMEOUT_BLOCK; // leave it to a client
    }
    if (timeout == SAHPI_TIMEOUT_IMMEDIATE) {
        runPolicy(R);
    } else if (timeout != SAHPI_TIMEOUT_BLOCK) {
        const SaHpiInt64T now = simHotSwapNowNs();
        hs.DeadlineNs = timeout > INT64_MAX - now ? INT64_MAX : now + timeout;
        hs.Counting = SAHPI_TRUE;
        simCountdownStarted();
    }
}

void enter(SimResourceT &R, SaHpiHsStateT State) noexcept
{
    SimHotSwapT &hs = R.HotSwap;
    const SaHpiHsStateT previous = hs.State;
    hs.State = State;
    hs.Counting = SAHPI_FALSE;
    simSensorsEvaluate(&R);
    publishHotSwap(R, previous);
    if (State == SAHPI_HS_STATE_NOT_PRESENT) {
        hs.Departing = SAHPI_TRUE;
    } else if (State == SAHPI_HS_STATE_INACTIVE && hs.Pulled) {
        enter(R, SAHPI_HS_STATE_NOT_PRESENT);
    } else if (isPending(State)) {
        startPolicy(R);
    }
}

// ResourceActiveSet and ResourceInactiveSet decide a pending state, whether
// its countdown still runs or a client stopped it.
SaErrorT decidePending(void *UserDefined, void (*Decide)(SimResourceT &)) noexcept
{
    SaErrorT rc = simWithResource(UserDefined, [&](SimResourceT &R) {
        if (!isPending(R.HotSwap.State)) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        Decide(R);
        return SA_OK;
    });
    if (rc == SA_OK) {
        simDepartIfDue(static_cast<SimResourceT *>(UserDefined));
    }
    return rc;
}

// An active board turns unhealthy when it stops running, and healthy again.
void followHealth(SimResourceT &R) noexcept
{
    if (isActive(R.HotSwap.State) && activeState(R) != R.HotSwap.State) {
        enter(R, activeState(R));
    }
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
        followHealth(R);
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
        followHealth(R);
        return SA_OK;
    });
}

// ---- Hot swap: the model ----

SaHpiBoolT simHotSwapTick(SimResourceT *Resource, SaHpiInt64T NowNs) noexcept
{
    if (Resource->HotSwap.Counting && NowNs >= Resource->HotSwap.DeadlineNs) {
        runPolicy(*Resource);
    }
    return Resource->HotSwap.Counting;
}

// The operator opens the latch and pulls the board as soon as it may: an
// active board asks for its extraction first and goes once it is inactive;
// a board that is not active goes at once.
SaErrorT simHotSwapPull(SimResourceT *Resource) noexcept
{
    SimHotSwapT &hs = Resource->HotSwap;
    if (hs.Pulled || hs.State == SAHPI_HS_STATE_NOT_PRESENT) {
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    hs.Pulled = SAHPI_TRUE;
    if (isActive(hs.State)) {
        enter(*Resource, SAHPI_HS_STATE_EXTRACTION_PENDING);
    } else if (hs.State != SAHPI_HS_STATE_EXTRACTION_PENDING) {
        powerOff(*Resource);
        enter(*Resource, SAHPI_HS_STATE_NOT_PRESENT);
    }
    return SA_OK;
}

// A board just registered as inserted, unpowered, with its latch closed.
void simHotSwapInserted(SimResourceT *Resource) noexcept
{
    enter(*Resource, SAHPI_HS_STATE_INSERTION_PENDING);
}

// ---- Hot swap: the slots ----

SaErrorT simHotSwapControlRequest(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return simWithResource(UserDefined, [](SimResourceT &R) {
        if (!isPending(R.HotSwap.State)) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        R.HotSwap.Counting = SAHPI_FALSE;
        return SA_OK;
    });
}

SaErrorT simResourceActiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return decidePending(UserDefined, activate);
}

SaErrorT simResourceInactiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined) noexcept
{
    return decidePending(UserDefined, deactivate);
}

SaErrorT simAutoExtractTimeoutGet(SaHpiDomainIdT, SaHpiResourceIdT, void *UserDefined,
                                  SaHpiTimeoutT *Timeout) noexcept
{
    return simReadResource(UserDefined, Timeout,
                           [](const SimResourceT &R) { return R.HotSwap.AutoExtractTimeout; });
}

// A new timeout counts from the next extraction; one running goes on.
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
        const SaHpiHsStateT state = R.HotSwap.State;
        switch (simRaw(Action)) {
        case SAHPI_HS_ACTION_INSERTION:
            if (state != SAHPI_HS_STATE_INACTIVE) {
                return SA_ERR_HPI_INVALID_REQUEST;
            }
            enter(R, SAHPI_HS_STATE_INSERTION_PENDING);
            return SA_OK;
        case SAHPI_HS_ACTION_EXTRACTION:
            if (!isActive(state)) {
                return SA_ERR_HPI_INVALID_REQUEST;
            }
            enter(R, SAHPI_HS_STATE_EXTRACTION_PENDING);
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
