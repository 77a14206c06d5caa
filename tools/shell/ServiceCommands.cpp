/* Commands on a resource's services: event logs, reset, power, parameter
 * control and hot swap. An event log is named by a resource or by "domain"
 * for the domain's own log. */
#include <algorithm>
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "HpiNames.h"
#include "HpiTable.h"
#include "Printers.h"
#include "Shell.h"

namespace
{

bool logOwner(KviShellT &Shell, const std::string &Arg, SaHpiResourceIdT *Rid)
{
    if (Arg == "domain") {
        *Rid = SAHPI_DOMAIN_CONTROLLER_ID;
        return true;
    }
    return kviShellResource(Shell, Arg, Rid);
}

bool logInfo(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiSelInfoT info;
    if (!logOwner(Shell, Args[0], &rid) ||
        !kviShellCheck("saHpiEventLogInfoGet",
                       HPI(saHpiEventLogInfoGet, Shell.Session, rid, &info)))
        return false;
    kviShellPrintSelInfo(info);
    return true;
}

bool logEntries(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    if (!logOwner(Shell, Args[0], &rid))
        return false;
    SaHpiSelEntryIdT entry = SAHPI_OLDEST_ENTRY, prev = 0;
    int count = 0;
    while (entry != SAHPI_NO_MORE_ENTRIES) {
        SaHpiSelEntryT sel;
        SaHpiRdrT rdr;
        SaHpiRptEntryT rpt;
        SaErrorT rc =
            HPI(saHpiEventLogEntryGet, Shell.Session, rid, entry, &prev, &entry, &sel, &rdr, &rpt);
        if (rc == SA_ERR_HPI_NOT_PRESENT && count == 0)
            break;
        if (!kviShellCheck("saHpiEventLogEntryGet", rc))
            return false;
        printf("%-5" PRIu32 " ", sel.EntryId);
        kviShellPrintEvent(sel.Event, &rdr, &rpt);
        count++;
    }
    printf("%d %s\n", count, count == 1 ? "entry" : "entries");
    return true;
}

bool logAdd(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    long long severity = 0;
    if (!logOwner(Shell, Args[0], &rid) ||
        !kviShellName(Args[1], kviShellSeverityNames, &severity, "severity"))
        return false;
    SaHpiSelEntryT entry;
    memset(&entry, 0, sizeof entry);
    entry.Event.Source = rid;
    entry.Event.EventType = SAHPI_ET_USER;
    entry.Event.Timestamp = SAHPI_TIME_UNSPECIFIED;
    entry.Event.Severity = static_cast<SaHpiSeverityT>(severity);
    memcpy(entry.Event.EventDataUnion.UserEvent.UserEventData, Args[2].c_str(),
           std::min<size_t>(Args[2].size(), SAHPI_USER_EVENT_DATA_SIZE));
    return kviShellCheck("saHpiEventLogEntryAdd",
                         HPI(saHpiEventLogEntryAdd, Shell.Session, rid, &entry), true);
}

bool logDelete(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    long long entry = 0;
    return logOwner(Shell, Args[0], &rid) &&
           kviShellNumber(Args[1], 0, UINT32_MAX, &entry, "entry") &&
           kviShellCheck("saHpiEventLogEntryDelete",
                         HPI(saHpiEventLogEntryDelete, Shell.Session, rid,
                             static_cast<SaHpiSelEntryIdT>(entry)),
                         true);
}

bool logClear(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    return logOwner(Shell, Args[0], &rid) &&
           kviShellCheck("saHpiEventLogClear", HPI(saHpiEventLogClear, Shell.Session, rid), true);
}

bool logTime(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    if (!logOwner(Shell, Args[0], &rid))
        return false;
    if (Args.size() == 1) {
        SaHpiTimeT time = 0;
        if (!kviShellCheck("saHpiEventLogTimeGet",
                           HPI(saHpiEventLogTimeGet, Shell.Session, rid, &time)))
            return false;
        printf("%s\n", kviShellTime(time).c_str());
        return true;
    }
    // Seconds since 1970, or "now".
    long long seconds = static_cast<long long>(::time(nullptr));
    if (Args[1] != "now" && !kviShellNumber(Args[1], 0, INT64_MAX / 1000000000, &seconds, "time"))
        return false;
    return kviShellCheck("saHpiEventLogTimeSet",
                         HPI(saHpiEventLogTimeSet, Shell.Session, rid,
                             static_cast<SaHpiTimeT>(seconds) * 1000000000),
                         true);
}

// "on"/"off" (or 1/0) into a boolean.
bool onOff(const std::string &Arg, SaHpiBoolT *Value)
{
    if (Arg == "on" || Arg == "1" || Arg == "off" || Arg == "0") {
        *Value = Arg == "on" || Arg == "1";
        return true;
    }
    printf("\"%s\" is neither on nor off\n", Arg.c_str());
    return false;
}

bool logState(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiBoolT enable = SAHPI_FALSE;
    if (!logOwner(Shell, Args[0], &rid))
        return false;
    if (Args.size() == 2)
        return onOff(Args[1], &enable) &&
               kviShellCheck("saHpiEventLogStateSet",
                             HPI(saHpiEventLogStateSet, Shell.Session, rid, enable), true);
    if (!kviShellCheck("saHpiEventLogStateGet",
                       HPI(saHpiEventLogStateGet, Shell.Session, rid, &enable)))
        return false;
    printf("%s\n", enable ? "enabled" : "disabled");
    return true;
}

// The get-or-set shape of reset, power and the hot-swap indicator: an
// enumeration read, or written when a name follows the resource.
template <class T>
bool enumGetSet(KviShellT &Shell, const KviShellArgsT &Args, const KviShellNameTableT &Names,
                const char *GetName, SaErrorT (*Get)(SaHpiSessionIdT, SaHpiResourceIdT, T *),
                const char *SetName, SaErrorT (*Set)(SaHpiSessionIdT, SaHpiResourceIdT, T))
{
    SaHpiResourceIdT rid = 0;
    if (!kviShellResource(Shell, Args[0], &rid))
        return false;
    if (Args.size() == 2) {
        long long value = 0;
        return kviShellName(Args[1], Names, &value, "state") &&
               kviShellCheck(SetName,
                             kviShellHpiCall(Set, Shell.Session, rid, static_cast<T>(value)), true);
    }
    T value{};
    if (!kviShellCheck(GetName, kviShellHpiCall(Get, Shell.Session, rid, &value)))
        return false;
    const char *name = kviShellNameOf(Names, value);
    printf("%s\n", name != nullptr ? name : "?");
    return true;
}

#define KVI_SHELL_GET_SET(get, set) #get, kviShellHpi.get, #set, kviShellHpi.set

bool resetState(KviShellT &Shell, const KviShellArgsT &Args)
{
    return enumGetSet(Shell, Args, kviShellResetActionNames,
                      KVI_SHELL_GET_SET(saHpiResourceResetStateGet, saHpiResourceResetStateSet));
}

bool powerState(KviShellT &Shell, const KviShellArgsT &Args)
{
    return enumGetSet(Shell, Args, kviShellHsPowerStateNames,
                      KVI_SHELL_GET_SET(saHpiResourcePowerStateGet, saHpiResourcePowerStateSet));
}

bool hsIndicator(KviShellT &Shell, const KviShellArgsT &Args)
{
    return enumGetSet(
        Shell, Args, kviShellHsIndicatorStateNames,
        KVI_SHELL_GET_SET(saHpiHotSwapIndicatorStateGet, saHpiHotSwapIndicatorStateSet));
}

bool parm(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    long long action = 0;
    std::string name = Args[1] + "_PARM";
    return kviShellResource(Shell, Args[0], &rid) &&
           kviShellName(name, kviShellParmActionNames, &action, "action") &&
           kviShellCheck(
               "saHpiParmControl",
               HPI(saHpiParmControl, Shell.Session, rid, static_cast<SaHpiParmActionT>(action)),
               true);
}

bool hsState(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiHsStateT state{};
    if (!kviShellResource(Shell, Args[0], &rid) ||
        !kviShellCheck("saHpiHotSwapStateGet",
                       HPI(saHpiHotSwapStateGet, Shell.Session, rid, &state)))
        return false;
    const char *name = kviShellNameOf(kviShellHsStateNames, state);
    printf("%s\n", name != nullptr ? name : "?");
    return true;
}

bool hsAction(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    long long action = 0;
    return kviShellResource(Shell, Args[0], &rid) &&
           kviShellName("HS_ACTION_" + Args[1], kviShellHsActionNames, &action, "action") &&
           kviShellCheck("saHpiHotSwapActionRequest",
                         HPI(saHpiHotSwapActionRequest, Shell.Session, rid,
                             static_cast<SaHpiHsActionT>(action)),
                         true);
}

// The hot-swap requests that take a resource and nothing else.
bool hsRequest(KviShellT &Shell, const KviShellArgsT &Args, const char *Name,
               SaErrorT (*Call)(SaHpiSessionIdT, SaHpiResourceIdT))
{
    SaHpiResourceIdT rid = 0;
    return kviShellResource(Shell, Args[0], &rid) &&
           kviShellCheck(Name, kviShellHpiCall(Call, Shell.Session, rid), true);
}

bool hsControl(KviShellT &Shell, const KviShellArgsT &Args)
{
    return hsRequest(Shell, Args, "saHpiHotSwapControlRequest",
                     kviShellHpi.saHpiHotSwapControlRequest);
}

bool hsActive(KviShellT &Shell, const KviShellArgsT &Args)
{
    return hsRequest(Shell, Args, "saHpiResourceActiveSet", kviShellHpi.saHpiResourceActiveSet);
}

bool hsInactive(KviShellT &Shell, const KviShellArgsT &Args)
{
    return hsRequest(Shell, Args, "saHpiResourceInactiveSet", kviShellHpi.saHpiResourceInactiveSet);
}

// A timeout in milliseconds, "block" or "immediate"; printed the same way.
bool timeoutParse(const std::string &Arg, SaHpiTimeoutT *Timeout)
{
    long long ms = 0;
    if (Arg == "block" || Arg == "immediate") {
        *Timeout = Arg == "block" ? SAHPI_TIMEOUT_BLOCK : SAHPI_TIMEOUT_IMMEDIATE;
        return true;
    }
    if (!kviShellNumber(Arg, 0, INT64_MAX / 1000000, &ms, "timeout"))
        return false;
    *Timeout = static_cast<SaHpiTimeoutT>(ms) * 1000000;
    return true;
}

void timeoutPrint(SaHpiTimeoutT Timeout)
{
    if (Timeout == SAHPI_TIMEOUT_BLOCK)
        printf("block\n");
    else
        printf("%" PRId64 " ms\n", static_cast<int64_t>(Timeout / 1000000));
}

bool autoInsert(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiTimeoutT timeout = 0;
    if (Args.size() == 1)
        return timeoutParse(Args[0], &timeout) &&
               kviShellCheck("saHpiAutoInsertTimeoutSet",
                             HPI(saHpiAutoInsertTimeoutSet, Shell.Session, timeout), true);
    if (!kviShellCheck("saHpiAutoInsertTimeoutGet",
                       HPI(saHpiAutoInsertTimeoutGet, Shell.Session, &timeout)))
        return false;
    timeoutPrint(timeout);
    return true;
}

bool autoExtract(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiTimeoutT timeout = 0;
    if (!kviShellResource(Shell, Args[0], &rid))
        return false;
    if (Args.size() == 2)
        return timeoutParse(Args[1], &timeout) &&
               kviShellCheck("saHpiAutoExtractTimeoutSet",
                             HPI(saHpiAutoExtractTimeoutSet, Shell.Session, rid, timeout), true);
    if (!kviShellCheck("saHpiAutoExtractTimeoutGet",
                       HPI(saHpiAutoExtractTimeoutGet, Shell.Session, rid, &timeout)))
        return false;
    timeoutPrint(timeout);
    return true;
}

} // namespace

const KviShellCommandT kviShellServiceCommands[] = {
    {"log info", 1, 1, "RID|domain", "an event log's size, state and clock", logInfo},
    {"log entries", 1, 1, "RID|domain", "an event log's entries, oldest first", logEntries},
    {"log add", 3, 3, "RID|domain SEVERITY \"TEXT\"", "add a user entry", logAdd},
    {"log delete", 2, 2, "RID|domain ENTRY", "delete one entry", logDelete},
    {"log clear", 1, 1, "RID|domain", "empty an event log", logClear},
    {"log time", 1, 2, "RID|domain [SECONDS|now]", "get or set an event log's clock", logTime},
    {"log state", 1, 2, "RID|domain [on|off]", "get or set whether a log records", logState},
    {"reset", 1, 2, "RID [ACTION]", "reset state (COLD_RESET, WARM_RESET, ...)", resetState},
    {"power", 1, 2, "RID [STATE]", "power state (HS_POWER_OFF, HS_POWER_ON, ...)", powerState},
    {"parm", 2, 2, "RID default|save|restore", "parameter control", parm},
    {"hotswap state", 1, 1, "RID", "a FRU's hot-swap state", hsState},
    {"hotswap action", 2, 2, "RID INSERTION|EXTRACTION", "request an insertion or extraction",
     hsAction},
    {"hotswap control", 1, 1, "RID", "take over a FRU's hot-swap policy", hsControl},
    {"hotswap active", 1, 1, "RID", "let a FRU become active", hsActive},
    {"hotswap inactive", 1, 1, "RID", "let a FRU become inactive", hsInactive},
    {"hotswap indicator", 1, 2, "RID [HS_INDICATOR_ON|HS_INDICATOR_OFF]",
     "get or set the hot-swap indicator", hsIndicator},
    {"hotswap insert-timeout", 0, 1, "[MS|block|immediate]", "get or set the auto-insert timeout",
     autoInsert},
    {"hotswap extract-timeout", 1, 2, "RID [MS|block|immediate]",
     "get or set a FRU's auto-extract timeout", autoExtract},
    {nullptr, 0, 0, nullptr, nullptr, nullptr},
};
