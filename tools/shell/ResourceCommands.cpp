/* Commands on resources and their records: the RPT, sensors, controls,
 * inventory and watchdog timers. */
#include <cinttypes>
#include <cstdio>
#include <cstring>

#include "HpiNames.h"
#include "HpiTable.h"
#include "Printers.h"
#include "Shell.h"

namespace
{

bool resources(KviShellT &Shell, const KviShellArgsT &)
{
    kviShellPrintRptHeader();
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    SaHpiRptEntryT rpt;
    while (entry != SAHPI_LAST_ENTRY) {
        SaErrorT rc = HPI(saHpiRptEntryGet, Shell.Session, entry, &entry, &rpt);
        if (rc == SA_ERR_HPI_NOT_PRESENT && entry == SAHPI_FIRST_ENTRY)
            break; // an empty table
        if (!kviShellCheck("saHpiRptEntryGet", rc))
            return false;
        kviShellPrintRptRow(rpt);
    }
    return true;
}

bool resource(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRptEntryT rpt;
    if (!kviShellResource(Shell, Args[0], &rid, &rpt))
        return false;
    kviShellPrintRptEntry(rpt);
    kviShellPrintRdrHeader();
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    SaHpiRdrT rdr;
    while (entry != SAHPI_LAST_ENTRY) {
        SaErrorT rc = HPI(saHpiRdrGet, Shell.Session, rid, entry, &entry, &rdr);
        if (rc == SA_ERR_HPI_NOT_PRESENT && entry == SAHPI_FIRST_ENTRY)
            break;
        if (!kviShellCheck("saHpiRdrGet", rc))
            return false;
        kviShellPrintRdrRow(rdr);
    }
    return true;
}

bool record(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    long long id = 0;
    if (!kviShellResource(Shell, Args[0], &rid) ||
        !kviShellNumber(Args[1], 0, UINT32_MAX - 1, &id, "record"))
        return false;
    SaHpiEntryIdT next = 0;
    SaHpiRdrT rdr;
    SaErrorT rc = HPI(saHpiRdrGet, Shell.Session, rid, static_cast<SaHpiEntryIdT>(id), &next, &rdr);
    if (rc == SA_ERR_HPI_NOT_PRESENT || rc == SA_ERR_HPI_INVALID_PARAMS) {
        printf("record: no record %lld on resource %" PRIu32 "\n", id, rid);
        return false;
    }
    if (!kviShellCheck("saHpiRdrGet", rc))
        return false;
    kviShellPrintRdr(rdr);
    return true;
}

bool tag(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    if (!kviShellResource(Shell, Args[0], &rid))
        return false;
    std::string text = Args[1];
    for (size_t i = 2; i < Args.size(); i++)
        text += " " + Args[i];
    if (text.size() > SAHPI_MAX_TEXT_BUFFER_LENGTH) {
        printf("tag: longer than %d characters\n", SAHPI_MAX_TEXT_BUFFER_LENGTH);
        return false;
    }
    SaHpiTextBufferT buffer;
    kviShellTextSet(&buffer, text.c_str());
    return kviShellCheck("saHpiResourceTagSet",
                         HPI(saHpiResourceTagSet, Shell.Session, rid, &buffer), true);
}

bool severity(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    long long value = 0;
    if (!kviShellResource(Shell, Args[0], &rid) ||
        !kviShellName(Args[1], kviShellSeverityNames, &value, "severity"))
        return false;
    return kviShellCheck(
        "saHpiResourceSeveritySet",
        HPI(saHpiResourceSeveritySet, Shell.Session, rid, static_cast<SaHpiSeverityT>(value)),
        true);
}

// The resource and the record of Type that Args[0] and Args[1] name.
bool target(KviShellT &Shell, const KviShellArgsT &Args, SaHpiRdrTypeT Type, SaHpiResourceIdT *Rid,
            SaHpiRdrT *Rdr)
{
    return kviShellResource(Shell, Args[0], Rid) && kviShellRecord(Shell, *Rid, Type, Args[1], Rdr);
}

SaHpiUint8T num(const SaHpiRdrT &Rdr)
{
    return kviShellRecordNum(Rdr);
}

// The get commands of a record: the record that Args name, read through the
// HPI function Get (called Call in the result line), printed by Print.
template <class ValueT, class GetT, class PrintT>
bool recordRead(KviShellT &Shell, const KviShellArgsT &Args, SaHpiRdrTypeT Type, const char *Call,
                GetT *Get, PrintT Print)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    ValueT value;
    if (!target(Shell, Args, Type, &rid, &rdr) ||
        !kviShellCheck(Call, kviShellHpiCall(Get, Shell.Session, rid, num(rdr), &value)))
        return false;
    Print(rdr, value);
    return true;
}

bool sensorRead(KviShellT &Shell, const KviShellArgsT &Args)
{
    return recordRead<SaHpiSensorReadingT>(
        Shell, Args, SAHPI_SENSOR_RDR, "saHpiSensorReadingGet", kviShellHpi.saHpiSensorReadingGet,
        [](const SaHpiRdrT &Rdr, const SaHpiSensorReadingT &Reading) {
            printf("%-22s %s", kviShellText(Rdr.IdString).c_str(),
                   kviShellReading(Reading, &Rdr).c_str());
            if (Reading.ValuesPresent & SAHPI_SRF_EVENT_STATE)
                printf(", state %s", kviShellEventStates(Reading.EventStatus.EventStatus,
                                                         Rdr.RdrTypeUnion.SensorRec.Category)
                                         .c_str());
            printf("\n");
        });
}

bool sensorThresholds(KviShellT &Shell, const KviShellArgsT &Args)
{
    return recordRead<SaHpiSensorThresholdsT>(
        Shell, Args, SAHPI_SENSOR_RDR, "saHpiSensorThresholdsGet",
        kviShellHpi.saHpiSensorThresholdsGet,
        [](const SaHpiRdrT &Rdr, const SaHpiSensorThresholdsT &Thresholds) {
            kviShellPrintThresholds(Thresholds, Rdr);
        });
}

SaHpiSensorReadingT *thresholdField(SaHpiSensorThresholdsT &T, const std::string &Name)
{
    const struct {
        const char *Name;
        SaHpiSensorReadingT *Field;
    } fields[] = {{"low-crit", &T.LowCritical},      {"low-major", &T.LowMajor},
                  {"low-minor", &T.LowMinor},        {"up-minor", &T.UpMinor},
                  {"up-major", &T.UpMajor},          {"up-crit", &T.UpCritical},
                  {"pos-hyst", &T.PosThdHysteresis}, {"neg-hyst", &T.NegThdHysteresis}};
    for (const auto &field : fields)
        if (Name == field.Name)
            return field.Field;
    printf("threshold: unknown \"%s\" (low-crit, low-major, low-minor, up-minor, up-major, "
           "up-crit, pos-hyst or neg-hyst)\n",
           Name.c_str());
    return nullptr;
}

// Writes Value into Reading in the form the sensor gave it: raw, or its interpreted type.
bool readingSet(SaHpiSensorReadingT *Reading, const std::string &Value)
{
    SaHpiSensorInterpretedT &v = Reading->Interpreted;
    long long number = 0;
    if (!(Reading->ValuesPresent & SAHPI_SRF_INTERPRETED) ||
        v.Type != SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32) {
        if (!kviShellNumber(Value, 0, UINT32_MAX, &number, "value"))
            return false;
    }
    if (Reading->ValuesPresent & SAHPI_SRF_INTERPRETED) {
        Reading->ValuesPresent = SAHPI_SRF_INTERPRETED;
        switch (v.Type) {
        case SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32: {
            char *end = nullptr;
            v.Value.SensorFloat32 = strtof(Value.c_str(), &end);
            if (Value.empty() || *end != '\0') {
                printf("value: \"%s\" is not a number\n", Value.c_str());
                return false;
            }
            return true;
        }
        case SAHPI_SENSOR_INTERPRETED_TYPE_UINT8:
            v.Value.SensorUint8 = static_cast<SaHpiUint8T>(number);
            return number <= UINT8_MAX || kviShellNumber(Value, 0, UINT8_MAX, &number, "value");
        default:
            v.Value.SensorUint32 = static_cast<SaHpiUint32T>(number);
            return true;
        }
    }
    Reading->ValuesPresent = SAHPI_SRF_RAW;
    Reading->Raw = static_cast<SaHpiUint32T>(number);
    return true;
}

bool sensorThresholdSet(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    SaHpiSensorThresholdsT current, change;
    if (!target(Shell, Args, SAHPI_SENSOR_RDR, &rid, &rdr) ||
        !kviShellCheck("saHpiSensorThresholdsGet",
                       HPI(saHpiSensorThresholdsGet, Shell.Session, rid, num(rdr), &current)))
        return false;
    // Only the named threshold is sent; the others stay as they are.
    memset(&change, 0, sizeof change);
    SaHpiSensorReadingT *field = thresholdField(current, Args[2]);
    if (field == nullptr || !readingSet(field, Args[3]))
        return false;
    *thresholdField(change, Args[2]) = *field;
    return kviShellCheck("saHpiSensorThresholdsSet",
                         HPI(saHpiSensorThresholdsSet, Shell.Session, rid, num(rdr), &change),
                         true);
}

bool sensorEnables(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    SaHpiSensorEvtEnablesT enables;
    if (!target(Shell, Args, SAHPI_SENSOR_RDR, &rid, &rdr))
        return false;
    SaHpiEventCategoryT category = rdr.RdrTypeUnion.SensorRec.Category;
    if (Args.size() == 2) {
        if (!kviShellCheck("saHpiSensorEventEnablesGet",
                           HPI(saHpiSensorEventEnablesGet, Shell.Session, rid, num(rdr), &enables)))
            return false;
        printf("status 0x%02X, assert %s, deassert %s\n", enables.SensorStatus,
               kviShellEventStates(enables.AssertEvents, category).c_str(),
               kviShellEventStates(enables.DeassertEvents, category).c_str());
        return true;
    }
    long long status = 0, assert = 0, deassert = 0;
    if (!kviShellNumber(Args[2], 0, UINT8_MAX, &status, "status") ||
        !kviShellNumber(Args[3], 0, UINT16_MAX, &assert, "assert") ||
        !kviShellNumber(Args[4], 0, UINT16_MAX, &deassert, "deassert"))
        return false;
    enables.SensorStatus = static_cast<SaHpiSensorStatusT>(status);
    enables.AssertEvents = static_cast<SaHpiEventStateT>(assert);
    enables.DeassertEvents = static_cast<SaHpiEventStateT>(deassert);
    return kviShellCheck("saHpiSensorEventEnablesSet",
                         HPI(saHpiSensorEventEnablesSet, Shell.Session, rid, num(rdr), &enables),
                         true);
}

bool sensorType(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    SaHpiSensorTypeT type;
    SaHpiEventCategoryT category = 0;
    if (!target(Shell, Args, SAHPI_SENSOR_RDR, &rid, &rdr) ||
        !kviShellCheck("saHpiSensorTypeGet",
                       HPI(saHpiSensorTypeGet, Shell.Session, rid, num(rdr), &type, &category)))
        return false;
    const char *typeName = kviShellNameOf(kviShellSensorTypeNames, type);
    const char *categoryName = kviShellNameOf(kviShellEventCategoryNames, category);
    printf("type %s, category %s\n", typeName ? typeName : "?", categoryName ? categoryName : "?");
    return true;
}

bool sensorConvert(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    long long raw = 0;
    if (!target(Shell, Args, SAHPI_SENSOR_RDR, &rid, &rdr) ||
        !kviShellNumber(Args[2], 0, UINT32_MAX, &raw, "raw"))
        return false;
    SaHpiSensorReadingT input, converted;
    memset(&input, 0, sizeof input);
    input.ValuesPresent = SAHPI_SRF_RAW;
    input.Raw = static_cast<SaHpiUint32T>(raw);
    if (!kviShellCheck("saHpiSensorReadingConvert", HPI(saHpiSensorReadingConvert, Shell.Session,
                                                        rid, num(rdr), &input, &converted)))
        return false;
    printf("raw %lld = %s\n", raw, kviShellReading(converted, &rdr).c_str());
    return true;
}

bool controlGet(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    SaHpiCtrlStateT state;
    memset(&state, 0, sizeof state);
    state.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
    if (!target(Shell, Args, SAHPI_CTRL_RDR, &rid, &rdr))
        return false;
    state.Type = rdr.RdrTypeUnion.CtrlRec.Type;
    if (!kviShellCheck("saHpiControlStateGet",
                       HPI(saHpiControlStateGet, Shell.Session, rid, num(rdr), &state)))
        return false;
    printf("%-22s ", kviShellText(rdr.IdString).c_str());
    kviShellPrintCtrlState(state);
    return true;
}

// Bytes given one a word (0x12 or 18) into Data; false past Max.
bool byteList(const KviShellArgsT &Args, size_t First, SaHpiUint8T *Data, size_t Max,
              SaHpiUint32T *Length)
{
    if (Args.size() - First > Max) {
        printf("control: at most %zu bytes\n", Max);
        return false;
    }
    for (size_t i = First; i < Args.size(); i++) {
        long long byte = 0;
        if (!kviShellNumber(Args[i], 0, UINT8_MAX, &byte, "byte"))
            return false;
        Data[i - First] = static_cast<SaHpiUint8T>(byte);
    }
    *Length = static_cast<SaHpiUint32T>(Args.size() - First);
    return true;
}

// The state of a control of Type from the words after its number.
bool ctrlStateParse(SaHpiCtrlTypeT Type, const KviShellArgsT &Args, SaHpiCtrlStateT *State)
{
    SaHpiCtrlStateUnionT &s = State->StateUnion;
    long long value = 0;
    SaHpiUint32T length = 0;
    State->Type = Type;
    switch (Type) {
    case SAHPI_CTRL_TYPE_DIGITAL:
        if (!kviShellValueOf(kviShellCtrlStateDigitalNames, ("CTRL_STATE_" + Args[2]).c_str(),
                             &value) &&
            !kviShellName(Args[2], kviShellCtrlStateDigitalNames, &value, "state"))
            return false;
        s.Digital = static_cast<SaHpiCtrlStateDigitalT>(value);
        return true;
    case SAHPI_CTRL_TYPE_DISCRETE:
        if (!kviShellNumber(Args[2], 0, UINT32_MAX, &value, "state"))
            return false;
        s.Discrete = static_cast<SaHpiCtrlStateDiscreteT>(value);
        return true;
    case SAHPI_CTRL_TYPE_ANALOG:
        if (!kviShellNumber(Args[2], INT32_MIN, INT32_MAX, &value, "state"))
            return false;
        s.Analog = static_cast<SaHpiCtrlStateAnalogT>(value);
        return true;
    case SAHPI_CTRL_TYPE_STREAM:
        s.Stream.Repeat = Args[2] == "repeat";
        return byteList(Args, Args[2] == "repeat" ? 3 : 2, s.Stream.Stream,
                        SAHPI_CTRL_MAX_STREAM_LENGTH, &s.Stream.StreamLength);
    case SAHPI_CTRL_TYPE_TEXT:
        if (Args.size() != 4 || !kviShellNumber(Args[2], 0, UINT8_MAX, &value, "line")) {
            if (Args.size() != 4)
                printf("control: a text control takes LINE \"TEXT\"\n");
            return false;
        }
        s.Text.Line = static_cast<SaHpiTxtLineNumT>(value);
        kviShellTextSet(&s.Text.Text, Args[3].c_str());
        return true;
    default:
        if (!kviShellNumber(Args[2], 0, UINT32_MAX, &value, "manufacturer") ||
            !byteList(Args, 3, s.Oem.Body, SAHPI_CTRL_MAX_OEM_BODY_LENGTH, &length))
            return false;
        s.Oem.MId = static_cast<SaHpiManufacturerIdT>(value);
        s.Oem.BodyLength = static_cast<SaHpiUint8T>(length);
        return true;
    }
}

bool controlSet(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    SaHpiCtrlStateT state;
    memset(&state, 0, sizeof state);
    if (!target(Shell, Args, SAHPI_CTRL_RDR, &rid, &rdr) ||
        !ctrlStateParse(rdr.RdrTypeUnion.CtrlRec.Type, Args, &state))
        return false;
    return kviShellCheck("saHpiControlStateSet",
                         HPI(saHpiControlStateSet, Shell.Session, rid, num(rdr), &state), true);
}

bool controlType(KviShellT &Shell, const KviShellArgsT &Args)
{
    return recordRead<SaHpiCtrlTypeT>(
        Shell, Args, SAHPI_CTRL_RDR, "saHpiControlTypeGet", kviShellHpi.saHpiControlTypeGet,
        [](const SaHpiRdrT &, SaHpiCtrlTypeT Type) {
            const char *name = kviShellNameOf(kviShellCtrlTypeNames, Type);
            printf("type %s\n", name ? name : "?");
        });
}

bool inventory(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    KviShellArgsT args = {Args[0], Args.size() > 1 ? Args[1] : "0"};
    if (!target(Shell, args, SAHPI_INVENTORY_RDR, &rid, &rdr))
        return false;
    // The records point into the same buffer; 64-bit aligned for their times.
    static SaHpiInt64T buffer[65536 / sizeof(SaHpiInt64T)];
    SaHpiUint32T actual = 0;
    auto *data = reinterpret_cast<SaHpiInventoryDataT *>(buffer);
    if (!kviShellCheck("saHpiEntityInventoryDataRead",
                       HPI(saHpiEntityInventoryDataRead, Shell.Session, rid,
                           rdr.RdrTypeUnion.InventoryRec.EirId, sizeof buffer, data, &actual)))
        return false;
    kviShellPrintInventory(*data);
    return true;
}

bool watchdogGet(KviShellT &Shell, const KviShellArgsT &Args)
{
    return recordRead<SaHpiWatchdogT>(
        Shell, Args, SAHPI_WATCHDOG_RDR, "saHpiWatchdogTimerGet", kviShellHpi.saHpiWatchdogTimerGet,
        [](const SaHpiRdrT &, const SaHpiWatchdogT &Watchdog) { kviShellPrintWatchdog(Watchdog); });
}

// One FIELD=VALUE of watchdog set into W.
bool watchdogField(SaHpiWatchdogT &W, const std::string &Arg)
{
    size_t equal = Arg.find('=');
    std::string field = Arg.substr(0, equal),
                value = equal == std::string::npos ? "" : Arg.substr(equal + 1);
    long long v = 0;
    if (field == "log" || field == "running") {
        if (!kviShellNumber(value, 0, 1, &v, field.c_str()))
            return false;
        (field == "log" ? W.Log : W.Running) = static_cast<SaHpiBoolT>(v);
    } else if (field == "initial" || field == "pretimeout") {
        if (!kviShellNumber(value, 0, UINT32_MAX, &v, field.c_str()))
            return false;
        (field == "initial" ? W.InitialCount : W.PreTimeoutInterval) = static_cast<SaHpiUint32T>(v);
    } else if (field == "action") {
        if (!kviShellName("WA_" + value, kviShellWatchdogActionNames, &v, "action"))
            return false;
        W.TimerAction = static_cast<SaHpiWatchdogActionT>(v);
    } else if (field == "use") {
        if (!kviShellName("WTU_" + value, kviShellWatchdogTimerUseNames, &v, "use"))
            return false;
        W.TimerUse = static_cast<SaHpiWatchdogTimerUseT>(v);
    } else if (field == "flags") {
        if (!kviShellNumber(value, 0, UINT8_MAX, &v, "flags"))
            return false;
        W.TimerUseExpFlags = static_cast<SaHpiWatchdogExpFlagsT>(v);
    } else {
        printf("watchdog: unknown \"%s\" (log=, running=, initial=, pretimeout=, action=, use=, "
               "flags=)\n",
               Arg.c_str());
        return false;
    }
    return true;
}

bool watchdogSet(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    SaHpiWatchdogT watchdog;
    if (!target(Shell, Args, SAHPI_WATCHDOG_RDR, &rid, &rdr) ||
        !kviShellCheck("saHpiWatchdogTimerGet",
                       HPI(saHpiWatchdogTimerGet, Shell.Session, rid, num(rdr), &watchdog)))
        return false;
    for (size_t i = 2; i < Args.size(); i++)
        if (!watchdogField(watchdog, Args[i]))
            return false;
    return kviShellCheck("saHpiWatchdogTimerSet",
                         HPI(saHpiWatchdogTimerSet, Shell.Session, rid, num(rdr), &watchdog), true);
}

bool watchdogReset(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    return target(Shell, Args, SAHPI_WATCHDOG_RDR, &rid, &rdr) &&
           kviShellCheck("saHpiWatchdogTimerReset",
                         HPI(saHpiWatchdogTimerReset, Shell.Session, rid, num(rdr)), true);
}

} // namespace

const KviShellCommandT kviShellResourceCommands[] = {
    {"resources", 0, 0, "", "the resource presence table", resources},
    {"resource", 1, 1, "RID", "one resource and its records", resource},
    {"record", 2, 2, "RID RECORD", "one record in full", record},
    {"tag", 2, 64, "RID TEXT", "set a resource's tag", tag},
    {"severity", 2, 2, "RID SEVERITY", "set a resource's severity (CRITICAL ... DEBUG)", severity},
    {"sensor read", 2, 2, "RID NUM", "a sensor's reading", sensorRead},
    {"sensor thresholds", 2, 2, "RID NUM", "a sensor's thresholds", sensorThresholds},
    {"sensor threshold-set", 4, 4, "RID NUM WHICH VALUE", "set one threshold (e.g. up-major 42)",
     sensorThresholdSet},
    {"sensor enables", 2, 5, "RID NUM [STATUS ASSERT DEASSERT]", "get or set event enables",
     sensorEnables},
    {"sensor type", 2, 2, "RID NUM", "a sensor's type and event category", sensorType},
    {"sensor convert", 3, 3, "RID NUM RAW", "convert a raw value", sensorConvert},
    {"control get", 2, 2, "RID NUM", "a control's state", controlGet},
    {"control set", 3, 3 + SAHPI_CTRL_MAX_OEM_BODY_LENGTH, "RID NUM STATE...",
     "set a control (ON/OFF/PULSE_ON/AUTO, number, bytes, LINE \"TEXT\")", controlSet},
    {"control type", 2, 2, "RID NUM", "a control's type", controlType},
    {"inventory", 1, 2, "RID [EIR]", "inventory data, field by field", inventory},
    {"watchdog get", 2, 2, "RID NUM", "a watchdog timer", watchdogGet},
    {"watchdog set", 3, 9, "RID NUM FIELD=VALUE...",
     "change a watchdog (initial=MS running=1 action=RESET ...)", watchdogSet},
    {"watchdog reset", 2, 2, "RID NUM", "restart a watchdog's count", watchdogReset},
    {nullptr, 0, 0, nullptr, nullptr, nullptr},
};
