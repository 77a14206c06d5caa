// The simulated shelf: shapes (what each kind of resource and record looks
// like) and state (what each one holds now). Private to the simulator plug-in;
// the plug-in sees the library only through KviDaemonCore.h.
#pragma once

#include <pthread.h>

#include <cstddef>
#include <cstring>

#include "KviDaemonCore.h"

// ---- Shapes: constant tables, one row per kind of record ----
// Members default to zero so that a table row names only what it uses.

// Where a sensor's raw reading comes from. Readings are pure functions of
// the resource's state, so a client sees every set it makes in the next read.
enum SimReadingSourceT {
    SIM_SRC_FIXED,        // always NominalRaw
    SIM_SRC_POWERED,      // NominalRaw while the resource runs, OffRaw otherwise
    SIM_SRC_FAN,          // follows the resource's fan-speed control
    SIM_SRC_AVAILABILITY, // discrete: running or powered off
    SIM_SRC_INTRUSION     // discrete: the chassis lid, always closed
};

struct SimSensorShapeT {
    const char *IdString = {}; // may hold one %u: the fan number
    SaHpiSensorTypeT Type = {};
    SaHpiEventCategoryT Category = {};
    SaHpiSensorEventCtrlT EventCtrl = {};
    SaHpiEventStateT Events = {};
    SaHpiBoolT IsThreshold = {};
    SaHpiSensorUnitsT Units = {};
    SaHpiInt16T M = {};
    SaHpiInt16T B = {};
    SaHpiInt8T ExpR = {};
    SaHpiInt8T ExpB = {};
    SimReadingSourceT Source = {};
    SaHpiUint32T NominalRaw = {};
    SaHpiUint32T OffRaw = {};
    // Raw thresholds in the order LowCritical, LowMajor, LowMinor, UpCritical,
    // UpMajor, UpMinor, then the positive and negative hysteresis.
    SaHpiUint32T Thresholds[8] = {};
    SaHpiSensorThdMaskT ReadThold = {};
    SaHpiSensorThdMaskT WriteThold = {};
    SaHpiEventStateT AssertEvents = {};   // enabled at start
    SaHpiEventStateT DeassertEvents = {}; // enabled at start
};

// What a control drives besides its own state.
enum SimControlRoleT {
    SIM_CTRL_PLAIN,
    SIM_CTRL_FAN_SPEED,    // analog percent read by the fan sensors
    SIM_CTRL_POWER_INHIBIT // digital: ON stops the resource's output
};

struct SimControlShapeT {
    const char *IdString = {};
    SaHpiCtrlTypeT Type = {};
    SaHpiCtrlOutputTypeT OutputType = {};
    SimControlRoleT Role = {};
    SaHpiInt32T Min = {};     // analog
    SaHpiInt32T Max = {};     // analog
    SaHpiInt32T Default = {}; // digital, discrete, analog
    const char *Text = {};    // text default, stream and OEM default bytes
    SaHpiUint8T Length = {};  // bytes of Text used by stream and OEM defaults
};

// Text controls are small displays: a fixed number of lines of fixed width.
constexpr SaHpiUint8T SIM_TEXT_LINES = 2;
constexpr SaHpiUint8T SIM_TEXT_CHARS = 16;

// The IANA number the simulator reports for its own OEM data. 0 is
// "unspecified": the simulator claims no real enterprise's number.
constexpr SaHpiManufacturerIdT SIM_MANUFACTURER_ID = SAHPI_MANUFACTURER_ID_UNSPECIFIED;

enum SimKindT { SIM_CHASSIS, SIM_PROCESSOR_BOARD, SIM_FAN_TRAY, SIM_POWER_SUPPLY, SIM_KIND_COUNT };

struct SimRecordShapeT {
    SaHpiRdrTypeT Type;
    const void *Shape; // SimSensorShapeT or SimControlShapeT; NULL otherwise
    SaHpiBoolT PerFan; // repeated for each fan of a tray
};

struct SimResourceShapeT {
    SimKindT Kind;
    const char *TagFormat; // one %u: the instance
    SaHpiEntityTypeT Entity;
    SaHpiCapabilitiesT Capabilities;
    SaHpiSeverityT Severity;
    const SimRecordShapeT *Records;
    SaHpiUint32T RecordCount;
};

const SimResourceShapeT *simResourceShape(SimKindT Kind) noexcept;

// ---- State ----

// Inventory data is kept serialized in a compact form of its own; see
// SimInventory.cpp. The capacity bounds what a client may write.
constexpr SaHpiUint32T SIM_INVENTORY_CAPACITY = 2048;

struct SimInventoryBlobT {
    SaHpiUint32T Length;
    SaHpiUint8T Bytes[SIM_INVENTORY_CAPACITY];
};

struct SimSensorStateT {
    const SimSensorShapeT *Shape;
    SaHpiBoolT Valid[8]; // threshold i holds a value
    SaHpiUint32T Raw[8]; // raw thresholds, order as in the shape
    SaHpiSensorEvtEnablesT Enables;
    SaHpiEventStateT State; // event state last evaluated
    SaHpiBoolT Driven;      // a test or shell set the raw reading
    SaHpiUint32T DrivenRaw;
};

struct SimControlStateT {
    const SimControlShapeT *Shape;
    SaHpiCtrlStateT State; // for text controls only Type is used
    SaHpiUint8T Display[SIM_TEXT_LINES][SIM_TEXT_CHARS];
    SaHpiUint8T LineLength[SIM_TEXT_LINES];
    SaHpiUint32T Pulses; // digital pulses given
};

struct SimInventoryStateT {
    SimInventoryBlobT *Data; // never NULL once discovered
};

struct SimWatchdogStateT {
    SaHpiWatchdogT Config; // Running and PresentCount kept below
    SaHpiBoolT Running;
    SaHpiBoolT PreTimeoutFired;
    SaHpiInt64T DeadlineMs;    // monotonic, while running
    SaHpiUint32T StoppedCount; // PresentCount while stopped
    SaHpiUint32T Expirations;
    SaHpiBoolT HasSaved;
    SaHpiWatchdogT Saved;
};

struct SimResourceT;

struct SimRecordT {
    SimResourceT *Resource;
    SaHpiRdrTypeT Type;
    SaHpiUint8T Num; // the number the library gave the record
    SaHpiUint8T Fan; // 1-based fan number for per-fan records
    SaHpiBoolT Removed;
    union {
        SimSensorStateT Sensor;
        SimControlStateT Control;
        SimInventoryStateT Inventory;
        SimWatchdogStateT Watchdog;
    };
};

constexpr SaHpiUint32T SIM_SEL_DEFAULT_SIZE = 64;

struct SimEventLogT {
    SaHpiSelEntryT *Entries; // oldest first; allocated with the first entry
    SaHpiUint32T Count;
    SaHpiUint32T Size;
    SaHpiSelEntryIdT NextId;
    SaHpiBoolT Enabled;
    SaHpiBoolT OverflowFlag;
    SaHpiTimeT Offset; // log clock minus HPI time
    SaHpiTimeT UpdateTimestamp;
};

struct SimHotSwapT {
    SaHpiHsStateT State;
    SaHpiHsIndicatorStateT Indicator;
    SaHpiTimeoutT AutoExtractTimeout;
    SaHpiBoolT Counting;    // the pending state's policy runs at DeadlineNs
    SaHpiInt64T DeadlineNs; // on the hot-swap clock (simHotSwapNowNs)
    SaHpiBoolT Pulled;      // the latch is open: the board goes once inactive
    SaHpiBoolT Departing;   // NOT_PRESENT: to be taken out of the RPT
};

struct SimResourceT {
    pthread_mutex_t Mutex; // guards everything below and the records
    const SimResourceShapeT *Shape;
    SaHpiUint32T Instance; // 1-based within its kind
    SaHpiDomainIdT DomainId;
    SaHpiResourceIdT ResourceId;
    SaHpiHsPowerStateT PowerState;
    SaHpiBoolT ResetAsserted;
    SaHpiUint32T ResetCount;
    SaHpiUint32T PowerCycles;
    SimHotSwapT HotSwap;
    SaHpiBoolT Departed;        // out of the registry, kept until finalization
    SimResourceT *NextDeparted; // the chain of departed resources
    SimEventLogT Log;
    SaHpiUint32T RecordCount;
    SimRecordT *Records; // in the same block, after this structure
};

// The value of an enumerated field as the client wrote it. A client may pass
// any number in an enum's bytes; reading such a value as the enum type is
// undefined in C++, so every check of client input goes through this.
template <typename E> SaHpiUint32T simRaw(const E &Value) noexcept
{
    static_assert(sizeof(E) == sizeof(SaHpiUint32T));
    SaHpiUint32T raw;
    memcpy(&raw, &Value, sizeof(raw));
    return raw;
}

// What parameter control asks of a record. The library saves and restores
// the resource's settings, its sensors' and its controls' itself, and puts
// the controls' defaults back; the simulator does the rest.
enum SimParmT { SIM_PARM_DEFAULT, SIM_PARM_SAVE, SIM_PARM_RESTORE };

// ---- Plug-in wide services (Simulator.cpp) ----

// Holds a resource's mutex for the lifetime of the object.
class SimLock
{
  public:
    explicit SimLock(SimResourceT *Resource) noexcept;
    ~SimLock();
    SimLock(const SimLock &) = delete;
    SimLock &operator=(const SimLock &) = delete;

  private:
    pthread_mutex_t *mutex_;
};

// The frames of the slots. A slot finds its resource or record in the pointer
// the library stored with the entry and refuses a missing one (or a record of
// another type); the body runs under the resource's mutex, and a record the
// library has removed answers NOT_PRESENT.
template <typename Body> SaErrorT simWithResource(void *UserDefined, Body body) noexcept
{
    auto *resource = static_cast<SimResourceT *>(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(resource);
    return body(*resource);
}

// A getter of a resource: stores what Read picks out in Out.
template <typename T, typename Read>
SaErrorT simReadResource(void *UserDefined, T *Out, Read read) noexcept
{
    if (Out == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithResource(UserDefined, [&](SimResourceT &R) {
        *Out = read(R);
        return SA_OK;
    });
}

inline SimRecordT *simRecordOf(void *UserData, SaHpiRdrTypeT Type) noexcept
{
    auto *record = static_cast<SimRecordT *>(UserData);
    return record != nullptr && record->Type == Type ? record : nullptr;
}

template <typename Body>
SaErrorT simWithRecord(void *UserData, SaHpiRdrTypeT Type, Body body) noexcept
{
    SimRecordT *record = simRecordOf(UserData, Type);
    if (record == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(record->Resource);
    if (record->Removed) {
        return SA_ERR_HPI_NOT_PRESENT;
    }
    return body(*record);
}

// The resource with that id. The pointer stays valid while the plug-in is
// loaded and the resource is in the table, which a slot call guarantees.
SimResourceT *simFindResource(SaHpiResourceIdT ResourceId) noexcept;
SaHpiInt64T simMonotonicMs() noexcept;
SaHpiTimeT simNow() noexcept;
// Tells the countdown thread that a watchdog or a hot-swap countdown started.
void simCountdownStarted() noexcept;
// The clock of the hot-swap countdowns, in nanoseconds: the machine's
// monotonic clock until a test takes it over (kviSimClockAdvance).
SaHpiInt64T simHotSwapNowNs() noexcept;
// Takes a resource that reached NOT_PRESENT out of the registry and the RPT.
// Called without the resource's mutex, which the removal takes.
void simDepartIfDue(SimResourceT *Resource) noexcept;
// A text buffer in English.
void simText(SaHpiTextBufferT *Buffer, const char *Text) noexcept;

// The tables resources and records are registered with; one per record type.
constexpr SaHpiUint32T SIM_RDR_TYPES = SAHPI_WATCHDOG_RDR + 1;
extern KviDsRptFnTable simRptFnTable;
extern KviDsRdrFnTable simRdrFnTables[SIM_RDR_TYPES];

// ---- Areas. Model functions expect the resource's mutex held; slots take
// it themselves. ----

// Resources (SimResource.cpp)
SaHpiBoolT simIsRunning(const SimResourceT *Resource) noexcept;
void simResourceInitialize(SimResourceT *Resource) noexcept;
void simResourceDefaults(SimResourceT *Resource) noexcept;
// Hot swap: runs the policy of a pending state whose countdown is over and
// returns whether a countdown still runs; the operator's pull and insertion.
SaHpiBoolT simHotSwapTick(SimResourceT *Resource, SaHpiInt64T NowNs) noexcept;
SaErrorT simHotSwapPull(SimResourceT *Resource) noexcept;
void simHotSwapInserted(SimResourceT *Resource) noexcept;

// Event log (SimEventLog.cpp): records an event of the resource in its log
// when the log is enabled, and posts it to the library's event queue. Sensor
// state changes, watchdog actions and hot-swap state changes come through
// here.
void simPublishEvent(SimResourceT *Resource, SaHpiEventT *Event) noexcept;
void simEventLogRelease(SimEventLogT *Log) noexcept;

// Sensors (SimSensors.cpp)
void simSensorRecord(const SimRecordT *Record, SaHpiSensorRecT *Rec) noexcept;
void simSensorInitialize(SimRecordT *Record) noexcept;
// Re-evaluates every sensor of the resource and publishes the changes.
void simSensorsEvaluate(SimResourceT *Resource) noexcept;
void simSensorDefaults(SimRecordT *Record) noexcept;

// Controls (SimControls.cpp)
void simControlRecord(const SimRecordT *Record, SaHpiCtrlRecT *Rec) noexcept;
void simControlInitialize(SimRecordT *Record) noexcept;
const SimRecordT *simFindControl(const SimResourceT *Resource, SimControlRoleT Role) noexcept;

// Inventory (SimInventory.cpp)
SaErrorT simInventoryInitialize(SimRecordT *Record) noexcept;
void simInventoryRelease(SimRecordT *Record) noexcept;
void simInventoryDefaults(SimRecordT *Record) noexcept;

// Watchdogs (SimWatchdog.cpp)
void simWatchdogInitialize(SimRecordT *Record) noexcept;
void simWatchdogStop(SimRecordT *Record) noexcept;
// Fires the pre-timeouts and expirations that are due; returns whether a
// watchdog of the resource still runs.
SaHpiBoolT simWatchdogTick(SimResourceT *Resource, SaHpiInt64T NowMs) noexcept;
SaErrorT simWatchdogParm(SimRecordT *Record, SimParmT Action) noexcept;

// ---- Slots of the resource table ----

SaErrorT simEventLogInfoGet(SaHpiDomainIdT, SaHpiResourceIdT, void *, SaHpiSelInfoT *) noexcept;
SaErrorT simEventLogEntryGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryIdT, void *,
                             SaHpiSelEntryIdT *, SaHpiSelEntryIdT *, SaHpiSelEntryT *, SaHpiRdrT *,
                             SaHpiRptEntryT *) noexcept;
SaErrorT simEventLogEntryAdd(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryT *, void *) noexcept;
SaErrorT simEventLogEntryDelete(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSelEntryIdT,
                                void *) noexcept;
SaErrorT simEventLogClear(SaHpiDomainIdT, SaHpiResourceIdT, void *) noexcept;
SaErrorT simEventLogTimeGet(SaHpiDomainIdT, SaHpiResourceIdT, void *, SaHpiTimeT *) noexcept;
SaErrorT simEventLogTimeSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiTimeT, void *) noexcept;
SaErrorT simEventLogStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *, SaHpiBoolT *) noexcept;
SaErrorT simEventLogStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiBoolT, void *) noexcept;
SaErrorT simHotSwapControlRequest(SaHpiDomainIdT, SaHpiResourceIdT, void *) noexcept;
SaErrorT simResourceActiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *) noexcept;
SaErrorT simResourceInactiveSet(SaHpiDomainIdT, SaHpiResourceIdT, void *) noexcept;
SaErrorT simAutoExtractTimeoutGet(SaHpiDomainIdT, SaHpiResourceIdT, void *,
                                  SaHpiTimeoutT *) noexcept;
SaErrorT simAutoExtractTimeoutSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiTimeoutT, void *) noexcept;
SaErrorT simHotSwapStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *, SaHpiHsStateT *) noexcept;
SaErrorT simHotSwapActionRequest(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsActionT, void *) noexcept;
SaErrorT simResourcePowerStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *,
                                  SaHpiHsPowerStateT *) noexcept;
SaErrorT simResourcePowerStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsPowerStateT,
                                  void *) noexcept;
SaErrorT simHotSwapIndicatorStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *,
                                     SaHpiHsIndicatorStateT *) noexcept;
SaErrorT simHotSwapIndicatorStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiHsIndicatorStateT,
                                     void *) noexcept;
SaErrorT simResourceResetStateGet(SaHpiDomainIdT, SaHpiResourceIdT, void *,
                                  SaHpiResetActionT *) noexcept;
SaErrorT simResourceResetStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiResetActionT,
                                  void *) noexcept;
SaErrorT simRptDefaultParmControl(SaHpiDomainIdT, SaHpiResourceIdT) noexcept;

// ---- Slots of the record table ----

SaErrorT simSensorReadingGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiEventCategoryT,
                             SaHpiRdrT *, void *, SaHpiSensorReadingT *) noexcept;
SaErrorT simSensorReadingConvert(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiRdrT *,
                                 SaHpiSensorReadingT *, void *, SaHpiSensorReadingT *) noexcept;
SaErrorT simSensorThresholdsGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiRdrT *,
                                void *, SaHpiSensorThresholdsT *) noexcept;
SaErrorT simSensorThresholdsSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiRdrT *,
                                SaHpiSensorThresholdsT *, void *) noexcept;
SaErrorT simSensorEventEnablesGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, void *,
                                  SaHpiCapabilitiesT, SaHpiEventCategoryT,
                                  SaHpiSensorEvtEnablesT *) noexcept;
SaErrorT simSensorEventEnablesSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT,
                                  SaHpiSensorEvtEnablesT *, SaHpiRdrT *, SaHpiCapabilitiesT,
                                  void *) noexcept;
SaErrorT simControlStateGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiCtrlNumT, void *,
                            SaHpiCtrlStateT *) noexcept;
SaErrorT simControlStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiCtrlNumT, SaHpiCtrlStateT *,
                            void *) noexcept;
SaErrorT simWatchdogTimerGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiWatchdogNumT, void *,
                             SaHpiWatchdogT *) noexcept;
SaErrorT simWatchdogTimerSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiWatchdogNumT, SaHpiWatchdogT *,
                             void *) noexcept;
SaErrorT simWatchdogTimerReset(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiWatchdogNumT,
                               void *) noexcept;
SaErrorT simEntityInventoryDataRead(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiEirIdT, SaHpiUint32T,
                                    void *, SaHpiInventoryDataT *, SaHpiUint32T *) noexcept;
SaErrorT simEntityInventoryDataWrite(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiEirIdT,
                                     SaHpiInventoryDataT *, void *) noexcept;
SaErrorT simActiveAlarmTranslate(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, void *,
                                 SaHpiRdrT *, SaHpiRptEntryT *, SaHpiEventT *) noexcept;
SaErrorT simRdrDefaultParmControl(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *, KviDsRdrFnTable *,
                                  void *) noexcept;
SaErrorT simRdrSaveParmControl(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *, KviDsRdrFnTable *,
                               void *) noexcept;
SaErrorT simRdrRestoreParmControl(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiBoolT, SaHpiRdrT *,
                                  KviDsRdrFnTable *, void *) noexcept;
