// Watchdog timers that really count down. The present count is computed
// from a monotonic deadline whenever it is read; the plug-in's countdown
// thread calls simWatchdogTick to fire pre-timeouts and expirations, which
// act on the resource (reset, power down, power cycle) and are logged.
#include <cstring>

#include "SimModel.h"

namespace
{

constexpr SaHpiUint32T INITIAL_COUNT_MS = 10000;

SaHpiUint32T remaining(const SimWatchdogStateT &W, SaHpiInt64T NowMs) noexcept
{
    if (!W.Running) {
        return W.StoppedCount;
    }
    SaHpiInt64T left = W.DeadlineMs - NowMs;
    return left <= 0 ? 0 : static_cast<SaHpiUint32T>(left);
}

void start(SimWatchdogStateT &W) noexcept
{
    W.Running = SAHPI_TRUE;
    W.PreTimeoutFired = SAHPI_FALSE;
    W.DeadlineMs = simMonotonicMs() + W.Config.InitialCount;
    simCountdownStarted();
}

void defaults(SimWatchdogStateT &W) noexcept
{
    memset(&W.Config, 0, sizeof(W.Config));
    W.Config.Log = SAHPI_TRUE;
    W.Config.TimerUse = SAHPI_WTU_SMS_OS;
    W.Config.TimerAction = SAHPI_WA_RESET;
    W.Config.PretimerInterrupt = SAHPI_WPI_NONE;
    W.Config.InitialCount = INITIAL_COUNT_MS;
    W.Running = SAHPI_FALSE;
    W.PreTimeoutFired = SAHPI_FALSE;
    W.StoppedCount = INITIAL_COUNT_MS;
}

bool validConfig(const SaHpiWatchdogT &W) noexcept
{
    SaHpiUint32T use = simRaw(W.TimerUse);
    SaHpiUint32T action = simRaw(W.TimerAction);
    SaHpiUint32T interrupt = simRaw(W.PretimerInterrupt);
    return W.Log <= SAHPI_TRUE && W.Running <= SAHPI_TRUE &&
           (use <= SAHPI_WTU_OEM || use == SAHPI_WTU_UNSPECIFIED) &&
           action <= SAHPI_WA_POWER_CYCLE &&
           (interrupt <= SAHPI_WPI_MESSAGE_INTERRUPT || interrupt == SAHPI_WPI_OEM);
}

SaHpiWatchdogExpFlagsT expirationFlag(SaHpiWatchdogTimerUseT Use) noexcept
{
    switch (Use) {
    case SAHPI_WTU_BIOS_FRB2:
        return SAHPI_WATCHDOG_EXP_BIOS_FRB2;
    case SAHPI_WTU_BIOS_POST:
        return SAHPI_WATCHDOG_EXP_BIOS_POST;
    case SAHPI_WTU_OS_LOAD:
        return SAHPI_WATCHDOG_EXP_OS_LOAD;
    case SAHPI_WTU_SMS_OS:
        return SAHPI_WATCHDOG_EXP_SMS_OS;
    case SAHPI_WTU_OEM:
        return SAHPI_WATCHDOG_EXP_OEM;
    default:
        return 0;
    }
}

void publish(SimRecordT *Record, SaHpiWatchdogActionEventT Action, SaHpiSeverityT Severity) noexcept
{
    const SimWatchdogStateT &w = Record->Watchdog;
    if (!w.Config.Log) {
        return;
    }
    SaHpiEventT event;
    memset(&event, 0, sizeof(event));
    event.Source = Record->Resource->ResourceId;
    event.EventType = SAHPI_ET_WATCHDOG;
    event.Timestamp = simNow();
    event.Severity = Severity;
    event.EventDataUnion.WatchdogEvent.WatchdogNum = Record->Num;
    event.EventDataUnion.WatchdogEvent.WatchdogAction = Action;
    event.EventDataUnion.WatchdogEvent.WatchdogPreTimerAction = w.Config.PretimerInterrupt;
    event.EventDataUnion.WatchdogEvent.WatchdogUse = w.Config.TimerUse;
    simPublishEvent(Record->Resource, &event);
}

void expire(SimRecordT *Record) noexcept
{
    SimWatchdogStateT &w = Record->Watchdog;
    SimResourceT *resource = Record->Resource;
    w.Running = SAHPI_FALSE;
    w.StoppedCount = 0;
    w.Expirations++;
    w.Config.TimerUseExpFlags |= expirationFlag(w.Config.TimerUse);
    SaHpiWatchdogActionEventT action = SAHPI_WAE_NO_ACTION;
    switch (w.Config.TimerAction) {
    case SAHPI_WA_RESET:
        action = SAHPI_WAE_RESET;
        resource->ResetCount++;
        break;
    case SAHPI_WA_POWER_DOWN:
        action = SAHPI_WAE_POWER_DOWN;
        resource->PowerState = SAHPI_HS_POWER_OFF;
        break;
    case SAHPI_WA_POWER_CYCLE:
        action = SAHPI_WAE_POWER_CYCLE;
        resource->PowerCycles++;
        resource->PowerState = SAHPI_HS_POWER_ON;
        break;
    default:
        break;
    }
    publish(Record, action, SAHPI_MAJOR);
    simSensorsEvaluate(resource);
}

} // namespace

// ---- Model ----

void simWatchdogInitialize(SimRecordT *Record) noexcept
{
    defaults(Record->Watchdog);
    Record->Watchdog.Expirations = 0;
    Record->Watchdog.HasSaved = SAHPI_FALSE;
}

void simWatchdogStop(SimRecordT *Record) noexcept
{
    SimWatchdogStateT &w = Record->Watchdog;
    if (w.Running) {
        w.StoppedCount = remaining(w, simMonotonicMs());
        w.Running = SAHPI_FALSE;
    }
}

SaHpiBoolT simWatchdogTick(SimResourceT *Resource, SaHpiInt64T NowMs) noexcept
{
    SaHpiBoolT running = SAHPI_FALSE;
    for (SaHpiUint32T i = 0; i < Resource->RecordCount; i++) {
        SimRecordT *record = &Resource->Records[i];
        if (record->Type != SAHPI_WATCHDOG_RDR || record->Removed || !record->Watchdog.Running) {
            continue;
        }
        SimWatchdogStateT &w = record->Watchdog;
        SaHpiUint32T left = remaining(w, NowMs);
        if (left == 0) {
            expire(record);
            continue;
        }
        if (!w.PreTimeoutFired && w.Config.PretimerInterrupt != SAHPI_WPI_NONE &&
            left <= w.Config.PreTimeoutInterval) {
            w.PreTimeoutFired = SAHPI_TRUE;
            publish(record, SAHPI_WAE_TIMER_INT, SAHPI_MINOR);
        }
        running = SAHPI_TRUE;
    }
    return running;
}

SaErrorT simWatchdogParm(SimRecordT *Record, SimParmT Action) noexcept
{
    SimWatchdogStateT &w = Record->Watchdog;
    switch (Action) {
    case SIM_PARM_DEFAULT:
        defaults(w);
        return SA_OK;
    case SIM_PARM_SAVE:
        w.Saved = w.Config;
        w.HasSaved = SAHPI_TRUE;
        return SA_OK;
    case SIM_PARM_RESTORE:
        if (!w.HasSaved) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        // The settings come back; a countdown does not restart by itself.
        w.Config = w.Saved;
        w.Running = SAHPI_FALSE;
        w.StoppedCount = w.Config.InitialCount;
        return SA_OK;
    }
    return SA_ERR_HPI_INVALID_PARAMS;
}

// ---- Slots ----

SaErrorT simWatchdogTimerGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiWatchdogNumT, void *UserData,
                             SaHpiWatchdogT *Watchdog) noexcept
{
    if (Watchdog == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_WATCHDOG_RDR, [&](SimRecordT &R) {
        const SimWatchdogStateT &w = R.Watchdog;
        *Watchdog = w.Config;
        Watchdog->Running = w.Running;
        Watchdog->PresentCount = remaining(w, simMonotonicMs());
        return SA_OK;
    });
}

SaErrorT simWatchdogTimerSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiWatchdogNumT,
                             SaHpiWatchdogT *Watchdog, void *UserData) noexcept
{
    if (simRecordOf(UserData, SAHPI_WATCHDOG_RDR) == nullptr || Watchdog == nullptr ||
        !validConfig(*Watchdog)) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (Watchdog->PreTimeoutInterval > Watchdog->InitialCount) {
        return SA_ERR_HPI_INVALID_DATA;
    }
    return simWithRecord(UserData, SAHPI_WATCHDOG_RDR, [&](SimRecordT &R) {
        SimWatchdogStateT &w = R.Watchdog;
        SaHpiWatchdogExpFlagsT flags = w.Config.TimerUseExpFlags;
        w.Config = *Watchdog;
        // Expiration flags written as 1 are cleared; the others stay.
        w.Config.TimerUseExpFlags =
            static_cast<SaHpiWatchdogExpFlagsT>(flags & ~Watchdog->TimerUseExpFlags);
        w.Config.Running = SAHPI_FALSE;
        w.Config.PresentCount = 0;
        // A running timer told to keep running restarts with the new count; a
        // stopped one stays stopped until a reset starts it.
        if (Watchdog->Running && w.Running) {
            start(w);
        } else {
            w.Running = SAHPI_FALSE;
            w.StoppedCount = w.Config.InitialCount;
        }
        return SA_OK;
    });
}

SaErrorT simWatchdogTimerReset(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiWatchdogNumT,
                               void *UserData) noexcept
{
    return simWithRecord(UserData, SAHPI_WATCHDOG_RDR, [](SimRecordT &R) {
        SimWatchdogStateT &w = R.Watchdog;
        // Once the pre-timeout has fired, only the expiration ends the countdown.
        if (w.Running && w.PreTimeoutFired) {
            return SA_ERR_HPI_INVALID_REQUEST;
        }
        start(w);
        return SA_OK;
    });
}
