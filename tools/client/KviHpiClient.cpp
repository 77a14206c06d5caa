// libKviHpiClient: the HPI A.01.01 calls of SaHpi.h, each sent to kvi-hpid
// as one request and answered by its response. A client program builds
// against SaHpi.h alone and links this library instead of the daemon's.
//
// The daemon is found through the environment: KVI_HPI_SERVER (an IPv4
// address or host name, default 127.0.0.1) and KVI_HPI_PORT (default 4743).
// KVI_HPI_TIMEOUT sets how long a call waits for its response (milliseconds,
// default 30000); KVI_LIB_LOG_LOCATION names a log file for the library's
// own lines (KVI_LIB_LOG_LEVEL their level, as "-l3").
//
// saHpiInitialize and saHpiFinalize are the client's own: they connect
// nothing. A call connects when it needs to; a connection that breaks gives
// SA_ERR_HPI_NO_RESPONSE, and the next call connects again (sessions of the
// broken connection are gone: open a new one).
#include <stdint.h>
#include <string.h>

#include "KviClientLink.h"
#include "coder/KviInventoryWire.h"
#include "coder/KviWireCalls.h"

#define KVI_CLIENT_API extern "C" __attribute__((visibility("default")))

namespace
{

struct AlignedBlock {
    alignas(KVI_WIRE_INVENTORY_ALIGN) SaHpiUint8T Bytes[KVI_WIRE_MAX_MSG];
};

// A call's request and response. Per thread, so threads call at once
// without 128 KiB on each stack.
struct Buffers {
    AlignedBlock Request;
    AlignedBlock Response;
};
thread_local Buffers buffers;

// The parameter letters of each generic call, by request code.
template <KviMsgTypeT Code> struct Call;
#define KVI_CLIENT_CALL(Code, Fn, Letters)                                                         \
    template <> struct Call<Code> {                                                                \
        static constexpr auto Function = Fn;                                                       \
        static constexpr auto Dirs = KviWireDirs(Letters);                                         \
    };
KVI_WIRE_CALLS(KVI_CLIENT_CALL)
#undef KVI_CLIENT_CALL

// Starts a request of Type; its body follows the sender's layout tag.
KviWireBody startRequest(KviMsgTypeT Type) noexcept
{
    kviWireStart(buffers.Request.Bytes, Type, 0);
    KviWireBody body(buffers.Request.Bytes, KVI_WIRE_MAX_MSG);
    body.put(KVI_WIRE_LAYOUT_TAG);
    return body;
}

// Sends the request in Body; on SA_OK *Result is the call's own result and
// the response's body is ready to be read.
SaErrorT exchange(KviWireBody &Body, SaHpiInt32T TimeoutMs, SaErrorT *Result) noexcept
{
    kviWireSeal(buffers.Request.Bytes, Body.end());
    const SaErrorT rc = kviClientExchange(buffers.Request.Bytes, buffers.Response.Bytes, TimeoutMs);
    *Result = reinterpret_cast<const KviRspMsgHdr *>(buffers.Response.Bytes)->SaRetCode;
    return rc;
}

KviWireBody responseBody() noexcept
{
    return KviWireBody(buffers.Response.Bytes,
                       reinterpret_cast<const KviMsgHdr *>(buffers.Response.Bytes)->MinHdr.Size);
}

// Results reach the caller's variables only when the call succeeded, as
// when the library is called in process.
template <KviMsgTypeT Code, typename... A>
SaErrorT callWithin(SaHpiInt32T TimeoutMs, A... Args) noexcept
{
    static_assert(
        std::is_same_v<decltype(kviWireRawFn(Call<Code>::Function)), SaErrorT (*)(A...) noexcept>);
    KviWireBody request = startRequest(Code);
    if (!kviWirePutCall<Call<Code>::Dirs>(request, Args...)) {
        return request.ok() ? SA_ERR_HPI_INVALID_PARAMS : SA_ERR_HPI_ERROR;
    }
    SaErrorT result = SA_OK;
    SaErrorT rc = exchange(request, TimeoutMs, &result);
    if (rc != SA_OK) {
        return rc;
    }
    KviWireBody response = responseBody();
    return kviWireGetCall<Call<Code>::Dirs>(response, result == SA_OK, Args...) ? result
                                                                                : SA_ERR_HPI_ERROR;
}

template <KviMsgTypeT Code, typename... A> SaErrorT call(A... Args) noexcept
{
    return callWithin<Code>(kviClientCallTimeout(), Args...);
}

// The response to an event wait may take as long as the wait, and then some.
SaHpiInt32T eventTimeout(SaHpiTimeoutT Timeout) noexcept
{
    if (Timeout == SAHPI_TIMEOUT_BLOCK) {
        return -1;
    }
    const SaHpiInt64T ms = (Timeout < 0 ? 0 : Timeout / 1000000) + kviClientCallTimeout();
    return ms > INT32_MAX ? -1 : static_cast<SaHpiInt32T>(ms);
}

} // namespace

KVI_CLIENT_API SaErrorT saHpiInitialize(SaHpiVersionT *HpiImplVersion) noexcept
{
    if (HpiImplVersion == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    const SaErrorT rc = kviClientInitialize();
    if (rc == SA_OK) {
        *HpiImplVersion = SAHPI_INTERFACE_VERSION;
    }
    return rc;
}

KVI_CLIENT_API SaErrorT saHpiFinalize(void) noexcept
{
    return kviClientFinalize();
}

KVI_CLIENT_API SaErrorT saHpiEntityInventoryDataRead(SaHpiSessionIdT SessionId,
                                                     SaHpiResourceIdT ResourceId, SaHpiEirIdT EirId,
                                                     SaHpiUint32T BufferSize,
                                                     SaHpiInventoryDataT *InventData,
                                                     SaHpiUint32T *ActualSize) noexcept
{
    if (InventData == nullptr || ActualSize == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviWireBody request = startRequest(KVI_ENTITY_INVENTORY_DATA_READ_REQ);
    request.put(SessionId);
    request.put(ResourceId);
    request.put(EirId);
    request.put(BufferSize);
    SaErrorT result = SA_OK;
    SaErrorT rc = exchange(request, kviClientCallTimeout(), &result);
    if (rc != SA_OK) {
        return rc;
    }
    KviWireBody response = responseBody();
    SaHpiUint32T actual = 0;
    SaHpiUint32T used = 0;
    response.get(actual);
    response.get(used);
    // The tree is rebuilt in a block of the daemon's alignment, then moved
    // into the caller's buffer, which must hold it whole.
    AlignedBlock &block = buffers.Request;
    response.get(block.Bytes, used);
    if (!response.finished() || used > BufferSize ||
        (used > 0 && kviWireInventoryRelocate(block.Bytes, used) != SA_OK)) {
        return SA_ERR_HPI_ERROR;
    }
    if (used > 0 &&
        (reinterpret_cast<uintptr_t>(InventData) % KVI_WIRE_INVENTORY_ALIGN != 0 ||
         kviWireInventoryFlatten(reinterpret_cast<SaHpiInventoryDataT *>(block.Bytes), block.Bytes,
                                 used, InventData, BufferSize, &used) != SA_OK ||
         kviWireInventoryRelocate(InventData, used) != SA_OK)) {
        return SA_ERR_HPI_ERROR;
    }
    *ActualSize = actual;
    return result;
}

KVI_CLIENT_API SaErrorT saHpiEntityInventoryDataWrite(SaHpiSessionIdT SessionId,
                                                      SaHpiResourceIdT ResourceId,
                                                      SaHpiEirIdT EirId,
                                                      SaHpiInventoryDataT *InventData) noexcept
{
    if (InventData == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviWireBody request = startRequest(KVI_ENTITY_INVENTORY_DATA_WRITE_REQ);
    request.put(SessionId);
    request.put(ResourceId);
    request.put(EirId);
    // The tree in wire form goes last, its size before it.
    static thread_local AlignedBlock block;
    SaHpiUint32T used = 0;
    if (kviWireInventoryFlatten(InventData, nullptr, 0, block.Bytes, KVI_WIRE_INVENTORY_MAX,
                                &used) != SA_OK) {
        return SA_ERR_HPI_INVALID_DATA;
    }
    request.put(used);
    request.put(block.Bytes, used);
    SaErrorT result = SA_OK;
    SaErrorT rc = exchange(request, kviClientCallTimeout(), &result);
    if (rc != SA_OK) {
        return rc;
    }
    return responseBody().finished() ? result : SA_ERR_HPI_ERROR;
}

KVI_CLIENT_API SaErrorT saHpiSessionOpen(SaHpiDomainIdT DomainId, SaHpiSessionIdT *SessionId,
                                         void *SecurityParams) noexcept
{
    return call<KVI_SESSION_OPEN_REQ>(DomainId, SessionId, SecurityParams);
}

KVI_CLIENT_API SaErrorT saHpiSessionClose(SaHpiSessionIdT SessionId) noexcept
{
    return call<KVI_SESSION_CLOSE_REQ>(SessionId);
}

KVI_CLIENT_API SaErrorT saHpiResourcesDiscover(SaHpiSessionIdT SessionId) noexcept
{
    return call<KVI_RESOURCES_DISCOVER_REQ>(SessionId);
}

KVI_CLIENT_API SaErrorT saHpiRptInfoGet(SaHpiSessionIdT SessionId, SaHpiRptInfoT *RptInfo) noexcept
{
    return call<KVI_RPT_INFO_GET_REQ>(SessionId, RptInfo);
}

KVI_CLIENT_API SaErrorT saHpiRptEntryGet(SaHpiSessionIdT SessionId, SaHpiEntryIdT EntryId,
                                         SaHpiEntryIdT *NextEntryId,
                                         SaHpiRptEntryT *RptEntry) noexcept
{
    return call<KVI_RPT_ENTRY_GET_REQ>(SessionId, EntryId, NextEntryId, RptEntry);
}

KVI_CLIENT_API SaErrorT saHpiRptEntryGetByResourceId(SaHpiSessionIdT SessionId,
                                                     SaHpiResourceIdT ResourceId,
                                                     SaHpiRptEntryT *RptEntry) noexcept
{
    return call<KVI_RPT_ENTRY_GET_BY_RESOURCE_ID_REQ>(SessionId, ResourceId, RptEntry);
}

KVI_CLIENT_API SaErrorT saHpiResourceSeveritySet(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId,
                                                 SaHpiSeverityT Severity) noexcept
{
    return call<KVI_RESOURCE_SEVERITY_SET_REQ>(SessionId, ResourceId, kviWireRaw(Severity));
}

KVI_CLIENT_API SaErrorT saHpiResourceTagSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                            SaHpiTextBufferT *ResourceTag) noexcept
{
    return call<KVI_RESOURCE_TAG_SET_REQ>(SessionId, ResourceId, ResourceTag);
}

KVI_CLIENT_API SaErrorT saHpiResourceIdGet(SaHpiSessionIdT SessionId,
                                           SaHpiResourceIdT *ResourceId) noexcept
{
    return call<KVI_RESOURCE_ID_GET_REQ>(SessionId, ResourceId);
}

KVI_CLIENT_API SaErrorT saHpiEntitySchemaGet(SaHpiSessionIdT SessionId,
                                             SaHpiUint32T *SchemaId) noexcept
{
    return call<KVI_ENTITY_SCHEMA_GET_REQ>(SessionId, SchemaId);
}

KVI_CLIENT_API SaErrorT saHpiEventLogInfoGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiSelInfoT *Info) noexcept
{
    return call<KVI_EVENT_LOG_INFO_GET_REQ>(SessionId, ResourceId, Info);
}

KVI_CLIENT_API SaErrorT saHpiEventLogEntryGet(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId, SaHpiSelEntryIdT EntryId,
                                              SaHpiSelEntryIdT *PrevEntryId,
                                              SaHpiSelEntryIdT *NextEntryId,
                                              SaHpiSelEntryT *EventLogEntry, SaHpiRdrT *Rdr,
                                              SaHpiRptEntryT *RptEntry) noexcept
{
    return call<KVI_EVENT_LOG_ENTRY_GET_REQ>(SessionId, ResourceId, EntryId, PrevEntryId,
                                             NextEntryId, EventLogEntry, Rdr, RptEntry);
}

KVI_CLIENT_API SaErrorT saHpiEventLogEntryAdd(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiSelEntryT *EvtEntry) noexcept
{
    return call<KVI_EVENT_LOG_ENTRY_ADD_REQ>(SessionId, ResourceId, EvtEntry);
}

KVI_CLIENT_API SaErrorT saHpiEventLogEntryDelete(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId,
                                                 SaHpiSelEntryIdT EntryId) noexcept
{
    return call<KVI_EVENT_LOG_ENTRY_DELETE_REQ>(SessionId, ResourceId, EntryId);
}

KVI_CLIENT_API SaErrorT saHpiEventLogClear(SaHpiSessionIdT SessionId,
                                           SaHpiResourceIdT ResourceId) noexcept
{
    return call<KVI_EVENT_LOG_CLEAR_REQ>(SessionId, ResourceId);
}

KVI_CLIENT_API SaErrorT saHpiEventLogTimeGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiTimeT *Time) noexcept
{
    return call<KVI_EVENT_LOG_TIME_GET_REQ>(SessionId, ResourceId, Time);
}

KVI_CLIENT_API SaErrorT saHpiEventLogTimeSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiTimeT Time) noexcept
{
    return call<KVI_EVENT_LOG_TIME_SET_REQ>(SessionId, ResourceId, Time);
}

KVI_CLIENT_API SaErrorT saHpiEventLogStateGet(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiBoolT *Enable) noexcept
{
    return call<KVI_EVENT_LOG_STATE_GET_REQ>(SessionId, ResourceId, Enable);
}

KVI_CLIENT_API SaErrorT saHpiEventLogStateSet(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiBoolT Enable) noexcept
{
    return call<KVI_EVENT_LOG_STATE_SET_REQ>(SessionId, ResourceId, Enable);
}

KVI_CLIENT_API SaErrorT saHpiSubscribe(SaHpiSessionIdT SessionId,
                                       SaHpiBoolT ProvideActiveAlarms) noexcept
{
    return call<KVI_SUBSCRIBE_REQ>(SessionId, ProvideActiveAlarms);
}

KVI_CLIENT_API SaErrorT saHpiUnsubscribe(SaHpiSessionIdT SessionId) noexcept
{
    return call<KVI_UNSUBSCRIBE_REQ>(SessionId);
}

KVI_CLIENT_API SaErrorT saHpiEventGet(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout,
                                      SaHpiEventT *Event, SaHpiRdrT *Rdr,
                                      SaHpiRptEntryT *RptEntry) noexcept
{
    return callWithin<KVI_EVENT_GET_REQ>(eventTimeout(Timeout), SessionId, Timeout, Event, Rdr,
                                         RptEntry);
}

KVI_CLIENT_API SaErrorT saHpiRdrGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                    SaHpiEntryIdT EntryId, SaHpiEntryIdT *NextEntryId,
                                    SaHpiRdrT *Rdr) noexcept
{
    return call<KVI_RDR_GET_REQ>(SessionId, ResourceId, EntryId, NextEntryId, Rdr);
}

KVI_CLIENT_API SaErrorT saHpiSensorReadingGet(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiSensorNumT SensorNum,
                                              SaHpiSensorReadingT *Reading) noexcept
{
    return call<KVI_SENSOR_READING_GET_REQ>(SessionId, ResourceId, SensorNum, Reading);
}

KVI_CLIENT_API SaErrorT saHpiSensorReadingConvert(SaHpiSessionIdT SessionId,
                                                  SaHpiResourceIdT ResourceId,
                                                  SaHpiSensorNumT SensorNum,
                                                  SaHpiSensorReadingT *ReadingInput,
                                                  SaHpiSensorReadingT *ConvertedReading) noexcept
{
    return call<KVI_SENSOR_READING_CONVERT_REQ>(SessionId, ResourceId, SensorNum, ReadingInput,
                                                ConvertedReading);
}

KVI_CLIENT_API SaErrorT saHpiSensorThresholdsGet(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId,
                                                 SaHpiSensorNumT SensorNum,
                                                 SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    return call<KVI_SENSOR_THRESHOLDS_GET_REQ>(SessionId, ResourceId, SensorNum, SensorThresholds);
}

KVI_CLIENT_API SaErrorT saHpiSensorThresholdsSet(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId,
                                                 SaHpiSensorNumT SensorNum,
                                                 SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    return call<KVI_SENSOR_THRESHOLDS_SET_REQ>(SessionId, ResourceId, SensorNum, SensorThresholds);
}

KVI_CLIENT_API SaErrorT saHpiSensorTypeGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                           SaHpiSensorNumT SensorNum, SaHpiSensorTypeT *Type,
                                           SaHpiEventCategoryT *Category) noexcept
{
    return call<KVI_SENSOR_TYPE_GET_REQ>(SessionId, ResourceId, SensorNum, Type, Category);
}

KVI_CLIENT_API SaErrorT saHpiSensorEventEnablesGet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiSensorNumT SensorNum,
                                                   SaHpiSensorEvtEnablesT *Enables) noexcept
{
    return call<KVI_SENSOR_EVENT_ENABLES_GET_REQ>(SessionId, ResourceId, SensorNum, Enables);
}

KVI_CLIENT_API SaErrorT saHpiSensorEventEnablesSet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiSensorNumT SensorNum,
                                                   SaHpiSensorEvtEnablesT *Enables) noexcept
{
    return call<KVI_SENSOR_EVENT_ENABLES_SET_REQ>(SessionId, ResourceId, SensorNum, Enables);
}

KVI_CLIENT_API SaErrorT saHpiControlTypeGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                            SaHpiCtrlNumT CtrlNum, SaHpiCtrlTypeT *Type) noexcept
{
    return call<KVI_CONTROL_TYPE_GET_REQ>(SessionId, ResourceId, CtrlNum, Type);
}

KVI_CLIENT_API SaErrorT saHpiControlStateGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiCtrlNumT CtrlNum,
                                             SaHpiCtrlStateT *CtrlState) noexcept
{
    return call<KVI_CONTROL_STATE_GET_REQ>(SessionId, ResourceId, CtrlNum, CtrlState);
}

KVI_CLIENT_API SaErrorT saHpiControlStateSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiCtrlNumT CtrlNum,
                                             SaHpiCtrlStateT *CtrlState) noexcept
{
    return call<KVI_CONTROL_STATE_SET_REQ>(SessionId, ResourceId, CtrlNum, CtrlState);
}

KVI_CLIENT_API SaErrorT saHpiWatchdogTimerGet(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiWatchdogNumT WatchdogNum,
                                              SaHpiWatchdogT *Watchdog) noexcept
{
    return call<KVI_WATCHDOG_TIMER_GET_REQ>(SessionId, ResourceId, WatchdogNum, Watchdog);
}

KVI_CLIENT_API SaErrorT saHpiWatchdogTimerSet(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiWatchdogNumT WatchdogNum,
                                              SaHpiWatchdogT *Watchdog) noexcept
{
    return call<KVI_WATCHDOG_TIMER_SET_REQ>(SessionId, ResourceId, WatchdogNum, Watchdog);
}

KVI_CLIENT_API SaErrorT saHpiWatchdogTimerReset(SaHpiSessionIdT SessionId,
                                                SaHpiResourceIdT ResourceId,
                                                SaHpiWatchdogNumT WatchdogNum) noexcept
{
    return call<KVI_WATCHDOG_TIMER_RESET_REQ>(SessionId, ResourceId, WatchdogNum);
}

KVI_CLIENT_API SaErrorT saHpiHotSwapControlRequest(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId) noexcept
{
    return call<KVI_HOTSWAP_CONTROL_REQUEST_REQ>(SessionId, ResourceId);
}

KVI_CLIENT_API SaErrorT saHpiResourceActiveSet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId) noexcept
{
    return call<KVI_RESOURCE_ACTIVE_SET_REQ>(SessionId, ResourceId);
}

KVI_CLIENT_API SaErrorT saHpiResourceInactiveSet(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId) noexcept
{
    return call<KVI_RESOURCE_INACTIVE_SET_REQ>(SessionId, ResourceId);
}

KVI_CLIENT_API SaErrorT saHpiAutoInsertTimeoutGet(SaHpiSessionIdT SessionId,
                                                  SaHpiTimeoutT *Timeout) noexcept
{
    return call<KVI_AUTO_INSERT_TIMEOUT_GET_REQ>(SessionId, Timeout);
}

KVI_CLIENT_API SaErrorT saHpiAutoInsertTimeoutSet(SaHpiSessionIdT SessionId,
                                                  SaHpiTimeoutT Timeout) noexcept
{
    return call<KVI_AUTO_INSERT_TIMEOUT_SET_REQ>(SessionId, Timeout);
}

KVI_CLIENT_API SaErrorT saHpiAutoExtractTimeoutGet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiTimeoutT *Timeout) noexcept
{
    return call<KVI_AUTO_EXTRACT_TIMEOUT_GET_REQ>(SessionId, ResourceId, Timeout);
}

KVI_CLIENT_API SaErrorT saHpiAutoExtractTimeoutSet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiTimeoutT Timeout) noexcept
{
    return call<KVI_AUTO_EXTRACT_TIMEOUT_SET_REQ>(SessionId, ResourceId, Timeout);
}

KVI_CLIENT_API SaErrorT saHpiHotSwapStateGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiHsStateT *State) noexcept
{
    return call<KVI_HOTSWAP_STATE_GET_REQ>(SessionId, ResourceId, State);
}

KVI_CLIENT_API SaErrorT saHpiHotSwapActionRequest(SaHpiSessionIdT SessionId,
                                                  SaHpiResourceIdT ResourceId,
                                                  SaHpiHsActionT Action) noexcept
{
    return call<KVI_HOTSWAP_ACTION_REQUEST_REQ>(SessionId, ResourceId, kviWireRaw(Action));
}

KVI_CLIENT_API SaErrorT saHpiResourcePowerStateGet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiHsPowerStateT *State) noexcept
{
    return call<KVI_RESOURCE_POWER_STATE_GET_REQ>(SessionId, ResourceId, State);
}

KVI_CLIENT_API SaErrorT saHpiResourcePowerStateSet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiHsPowerStateT State) noexcept
{
    return call<KVI_RESOURCE_POWER_STATE_SET_REQ>(SessionId, ResourceId, kviWireRaw(State));
}

KVI_CLIENT_API SaErrorT saHpiHotSwapIndicatorStateGet(SaHpiSessionIdT SessionId,
                                                      SaHpiResourceIdT ResourceId,
                                                      SaHpiHsIndicatorStateT *State) noexcept
{
    return call<KVI_HOTSWAP_INDICATOR_STATE_GET_REQ>(SessionId, ResourceId, State);
}

KVI_CLIENT_API SaErrorT saHpiHotSwapIndicatorStateSet(SaHpiSessionIdT SessionId,
                                                      SaHpiResourceIdT ResourceId,
                                                      SaHpiHsIndicatorStateT State) noexcept
{
    return call<KVI_HOTSWAP_INDICATOR_STATE_SET_REQ>(SessionId, ResourceId, kviWireRaw(State));
}

KVI_CLIENT_API SaErrorT saHpiParmControl(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiParmActionT Action) noexcept
{
    return call<KVI_PARM_CONTROL_REQ>(SessionId, ResourceId, kviWireRaw(Action));
}

KVI_CLIENT_API SaErrorT saHpiResourceResetStateGet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiResetActionT *ResetAction) noexcept
{
    return call<KVI_RESOURCE_RESET_STATE_GET_REQ>(SessionId, ResourceId, ResetAction);
}

KVI_CLIENT_API SaErrorT saHpiResourceResetStateSet(SaHpiSessionIdT SessionId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiResetActionT ResetAction) noexcept
{
    return call<KVI_RESOURCE_RESET_STATE_SET_REQ>(SessionId, ResourceId, kviWireRaw(ResetAction));
}
