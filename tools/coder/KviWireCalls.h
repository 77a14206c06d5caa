/* Which HPI call each message type carries, and how its parameters travel.
 *
 * Each parameter of a call has a letter, in the order of its prototype:
 *   i  input: sent in the request (a pointer parameter sends what it points to)
 *   o  output: sent back in the response
 *   b  optional output (a pointer the caller may leave NULL): the request
 *      says whether it is wanted, the response always carries it
 *   z  not sent: the daemon passes NULL (the reserved SecurityParams)
 * The two inventory calls, whose data is a tree of pointers, are coded by
 * hand (KviInventoryWire.h) and are not in this table.
 */
#ifndef KVI_WIRE_CALLS_H
#define KVI_WIRE_CALLS_H

#include <stddef.h>
#include <string.h>

#include <tuple>
#include <type_traits>
#include <utility>

#include "KviParamCoder.h"

/* X(request code, function, parameter letters) for every call with a
 * generic body. */
#define KVI_WIRE_CALLS(X)                                                                          \
    X(KVI_SESSION_OPEN_REQ, saHpiSessionOpen, "ioz")                                               \
    X(KVI_SESSION_CLOSE_REQ, saHpiSessionClose, "i")                                               \
    X(KVI_RESOURCES_DISCOVER_REQ, saHpiResourcesDiscover, "i")                                     \
    X(KVI_RPT_INFO_GET_REQ, saHpiRptInfoGet, "io")                                                 \
    X(KVI_RPT_ENTRY_GET_REQ, saHpiRptEntryGet, "iioo")                                             \
    X(KVI_RPT_ENTRY_GET_BY_RESOURCE_ID_REQ, saHpiRptEntryGetByResourceId, "iio")                   \
    X(KVI_RESOURCE_SEVERITY_SET_REQ, saHpiResourceSeveritySet, "iii")                              \
    X(KVI_RESOURCE_TAG_SET_REQ, saHpiResourceTagSet, "iii")                                        \
    X(KVI_RESOURCE_ID_GET_REQ, saHpiResourceIdGet, "io")                                           \
    X(KVI_ENTITY_SCHEMA_GET_REQ, saHpiEntitySchemaGet, "io")                                       \
    X(KVI_EVENT_LOG_INFO_GET_REQ, saHpiEventLogInfoGet, "iio")                                     \
    X(KVI_EVENT_LOG_ENTRY_GET_REQ, saHpiEventLogEntryGet, "iiiooobb")                              \
    X(KVI_EVENT_LOG_ENTRY_ADD_REQ, saHpiEventLogEntryAdd, "iii")                                   \
    X(KVI_EVENT_LOG_ENTRY_DELETE_REQ, saHpiEventLogEntryDelete, "iii")                             \
    X(KVI_EVENT_LOG_CLEAR_REQ, saHpiEventLogClear, "ii")                                           \
    X(KVI_EVENT_LOG_TIME_GET_REQ, saHpiEventLogTimeGet, "iio")                                     \
    X(KVI_EVENT_LOG_TIME_SET_REQ, saHpiEventLogTimeSet, "iii")                                     \
    X(KVI_EVENT_LOG_STATE_GET_REQ, saHpiEventLogStateGet, "iio")                                   \
    X(KVI_EVENT_LOG_STATE_SET_REQ, saHpiEventLogStateSet, "iii")                                   \
    X(KVI_SUBSCRIBE_REQ, saHpiSubscribe, "ii")                                                     \
    X(KVI_UNSUBSCRIBE_REQ, saHpiUnsubscribe, "i")                                                  \
    X(KVI_EVENT_GET_REQ, saHpiEventGet, "iiobb")                                                   \
    X(KVI_RDR_GET_REQ, saHpiRdrGet, "iiioo")                                                       \
    X(KVI_SENSOR_READING_GET_REQ, saHpiSensorReadingGet, "iiio")                                   \
    X(KVI_SENSOR_READING_CONVERT_REQ, saHpiSensorReadingConvert, "iiiio")                          \
    X(KVI_SENSOR_THRESHOLDS_GET_REQ, saHpiSensorThresholdsGet, "iiio")                             \
    X(KVI_SENSOR_THRESHOLDS_SET_REQ, saHpiSensorThresholdsSet, "iiii")                             \
    X(KVI_SENSOR_TYPE_GET_REQ, saHpiSensorTypeGet, "iiioo")                                        \
    X(KVI_SENSOR_EVENT_ENABLES_GET_REQ, saHpiSensorEventEnablesGet, "iiio")                        \
    X(KVI_SENSOR_EVENT_ENABLES_SET_REQ, saHpiSensorEventEnablesSet, "iiii")                        \
    X(KVI_CONTROL_TYPE_GET_REQ, saHpiControlTypeGet, "iiio")                                       \
    X(KVI_CONTROL_STATE_GET_REQ, saHpiControlStateGet, "iiio")                                     \
    X(KVI_CONTROL_STATE_SET_REQ, saHpiControlStateSet, "iiii")                                     \
    X(KVI_WATCHDOG_TIMER_GET_REQ, saHpiWatchdogTimerGet, "iiio")                                   \
    X(KVI_WATCHDOG_TIMER_SET_REQ, saHpiWatchdogTimerSet, "iiii")                                   \
    X(KVI_WATCHDOG_TIMER_RESET_REQ, saHpiWatchdogTimerReset, "iii")                                \
    X(KVI_HOTSWAP_CONTROL_REQUEST_REQ, saHpiHotSwapControlRequest, "ii")                           \
    X(KVI_RESOURCE_ACTIVE_SET_REQ, saHpiResourceActiveSet, "ii")                                   \
    X(KVI_RESOURCE_INACTIVE_SET_REQ, saHpiResourceInactiveSet, "ii")                               \
    X(KVI_AUTO_INSERT_TIMEOUT_GET_REQ, saHpiAutoInsertTimeoutGet, "io")                            \
    X(KVI_AUTO_INSERT_TIMEOUT_SET_REQ, saHpiAutoInsertTimeoutSet, "ii")                            \
    X(KVI_AUTO_EXTRACT_TIMEOUT_GET_REQ, saHpiAutoExtractTimeoutGet, "iio")                         \
    X(KVI_AUTO_EXTRACT_TIMEOUT_SET_REQ, saHpiAutoExtractTimeoutSet, "iii")                         \
    X(KVI_HOTSWAP_STATE_GET_REQ, saHpiHotSwapStateGet, "iio")                                      \
    X(KVI_HOTSWAP_ACTION_REQUEST_REQ, saHpiHotSwapActionRequest, "iii")                            \
    X(KVI_RESOURCE_POWER_STATE_GET_REQ, saHpiResourcePowerStateGet, "iio")                         \
    X(KVI_RESOURCE_POWER_STATE_SET_REQ, saHpiResourcePowerStateSet, "iii")                         \
    X(KVI_HOTSWAP_INDICATOR_STATE_GET_REQ, saHpiHotSwapIndicatorStateGet, "iio")                   \
    X(KVI_HOTSWAP_INDICATOR_STATE_SET_REQ, saHpiHotSwapIndicatorStateSet, "iii")                   \
    X(KVI_PARM_CONTROL_REQ, saHpiParmControl, "iii")                                               \
    X(KVI_RESOURCE_RESET_STATE_GET_REQ, saHpiResourceResetStateGet, "iio")                         \
    X(KVI_RESOURCE_RESET_STATE_SET_REQ, saHpiResourceResetStateSet, "iii")

/* A call's parameter letters as a template argument. */
template <size_t N> struct KviWireDirs {
    char Letters[N];
    consteval KviWireDirs(const char (&Text)[N])
    {
        for (size_t i = 0; i < N; ++i) {
            Letters[i] = Text[i];
        }
    }
};

template <typename F> struct KviWireFn;
template <typename... A> struct KviWireFn<SaErrorT (*)(A...) noexcept> {
    using Args = std::tuple<A...>;
    static constexpr size_t Count = sizeof...(A);
};

/* Where a parameter is held while its message is coded: the pointed-to
 * type of a pointer, the type itself otherwise. */
template <typename A>
using KviWireSlotT =
    std::conditional_t<std::is_pointer_v<A>,
                       std::conditional_t<std::is_void_v<std::remove_pointer_t<A>>, char,
                                          std::remove_const_t<std::remove_pointer_t<A>>>,
                       A>;

/* An enumeration passed by value travels, and is held, as the number it is:
 * a C caller or a peer may pass any number, the call refuses what is not
 * one of the enumeration's values, and only C lets such a number be the
 * enumeration. So C++ here never reads one as the enumeration: it copies the
 * caller's bytes (kviWireRaw) and calls through the C signature with the
 * enumeration's underlying type (kviWireRawFn), which is the same ABI. */
template <typename A> struct KviWireRawOf {
    using Type = A;
};
template <typename A>
requires std::is_enum_v<A>
struct KviWireRawOf<A> {
    using Type = std::underlying_type_t<A>;
};
template <typename A> using KviWireRawT = typename KviWireRawOf<A>::Type;

template <typename T> KviWireRawT<T> kviWireRaw(const T &Value) noexcept
{
    KviWireRawT<T> raw;
    memcpy(&raw, &Value, sizeof raw);
    return raw;
}

template <typename... A> auto kviWireRawFn(SaErrorT (*Fn)(A...) noexcept) noexcept
{
    return reinterpret_cast<SaErrorT (*)(KviWireRawT<A>...) noexcept>(Fn);
}

/* Sends the request's part of one parameter (client side). */
template <char L, typename A> bool kviWirePutParam(KviWireBody &Body, A Arg) noexcept
{
    if constexpr (L == 'i') {
        if constexpr (std::is_pointer_v<A>) {
            if (Arg == nullptr) {
                return false;
            }
            Body.put(*Arg);
        } else {
            Body.put(Arg);
        }
    } else if constexpr (L == 'o') {
        return Arg != nullptr;
    } else if constexpr (L == 'b') {
        const SaHpiBoolT wanted = Arg != nullptr ? SAHPI_TRUE : SAHPI_FALSE;
        Body.put(wanted);
    }
    return true;
}

/* Takes the response's part of one parameter (client side); Keep false
 * checks and skips it. */
template <char L, typename A> void kviWireGetParam(KviWireBody &Body, A Arg, bool Keep) noexcept
{
    if constexpr (L == 'o' || L == 'b') {
        Body.get(Keep && Arg != nullptr ? static_cast<void *>(Arg) : nullptr,
                 sizeof(KviWireSlotT<A>));
    }
}

/* The daemon's side of one parameter: taken from the request, handed to
 * the call, and sent back when it is a result. */
template <char L, typename A> struct KviWireServerParam {
    KviWireSlotT<KviWireRawT<A>> Slot{};
    bool Wanted = false;

    void get(KviWireBody &Body) noexcept
    {
        if constexpr (L == 'i') {
            Body.get(Slot);
        } else if constexpr (L == 'b') {
            SaHpiBoolT wanted = SAHPI_FALSE;
            Body.get(wanted);
            Wanted = wanted != SAHPI_FALSE;
        }
    }
    KviWireRawT<A> arg() noexcept
    {
        if constexpr (L == 'z') {
            return nullptr;
        } else if constexpr (L == 'b') {
            return Wanted ? &Slot : nullptr;
        } else if constexpr (std::is_pointer_v<A>) {
            return &Slot;
        } else {
            return Slot;
        }
    }
    void put(KviWireBody &Body) const noexcept
    {
        if constexpr (L == 'o' || L == 'b') {
            Body.put(Slot);
        }
    }
};

/* Serves one request of a generic call: takes the request's parameters out
 * of In, calls Fn, writes the results to Out. False when the request's body
 * does not match the call (nothing is called then). */
template <auto Fn, KviWireDirs D>
bool kviWireServe(KviWireBody &In, KviWireBody &Out, SaErrorT *Result) noexcept
{
    using Fn_ = KviWireFn<decltype(Fn)>;
    static_assert(sizeof(D.Letters) == Fn_::Count + 1, "one letter per parameter");
    return [&]<size_t... I>(std::index_sequence<I...>)
    {
        std::tuple<KviWireServerParam<D.Letters[I], std::tuple_element_t<I, typename Fn_::Args>>...>
            params;
        (std::get<I>(params).get(In), ...);
        if (!In.finished()) {
            return false;
        }
        *Result = kviWireRawFn(Fn)(std::get<I>(params).arg()...);
        (std::get<I>(params).put(Out), ...);
        return Out.ok();
    }
    (std::make_index_sequence<Fn_::Count>{});
}

/* The client's side of a generic call: fills the request body (false when
 * a required pointer is NULL), and after the exchange takes the results,
 * keeping them in the caller's variables only when Keep says so. */
template <KviWireDirs D, typename... A> bool kviWirePutCall(KviWireBody &Body, A... Args) noexcept
{
    static_assert(sizeof(D.Letters) == sizeof...(A) + 1, "one letter per parameter");
    return [&]<size_t... I>(std::index_sequence<I...>)
    {
        return (kviWirePutParam<D.Letters[I]>(Body, Args) && ...) && Body.ok();
    }
    (std::index_sequence_for<A...>{});
}

template <KviWireDirs D, typename... A>
bool kviWireGetCall(KviWireBody &Body, bool Keep, A... Args) noexcept
{
    [&]<size_t... I>(std::index_sequence<I...>)
    {
        (kviWireGetParam<D.Letters[I]>(Body, Args, Keep), ...);
    }
    (std::index_sequence_for<A...>{});
    return Body.finished();
}

#endif
