/* Printers of HPI types. */
#include "Printers.h"

#include <cinttypes>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "HpiNames.h"
#include "HpiTable.h"

namespace
{

std::string nameOr(const KviShellNameTableT &Table, long long Value)
{
    const char *name = kviShellNameOf(Table, Value);
    if (name != nullptr)
        return name;
    char number[32];
    snprintf(number, sizeof number, "0x%llX", Value);
    return number;
}

std::string format(const char *Format, ...) __attribute__((format(printf, 1, 2)));
std::string format(const char *Format, ...)
{
    char line[512];
    va_list args;
    va_start(args, Format);
    vsnprintf(line, sizeof line, Format, args);
    va_end(args);
    return line;
}

// Units as a reader writes them after a number; the rest by their name.
const char *unitText(SaHpiSensorUnitsT Units)
{
    switch (Units) {
    case SAHPI_SU_UNSPECIFIED:
        return "";
    case SAHPI_SU_DEGREES_C:
        return " C";
    case SAHPI_SU_DEGREES_F:
        return " F";
    case SAHPI_SU_VOLTS:
        return " V";
    case SAHPI_SU_AMPS:
        return " A";
    case SAHPI_SU_WATTS:
        return " W";
    case SAHPI_SU_RPM:
        return " RPM";
    default:
        return nullptr;
    }
}

std::string interpreted(const SaHpiSensorInterpretedT &Value)
{
    const SaHpiSensorInterpretedUnionT &v = Value.Value;
    switch (Value.Type) {
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT8:
        return format("%u", v.SensorUint8);
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT16:
        return format("%u", v.SensorUint16);
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT32:
        return format("%" PRIu32, v.SensorUint32);
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT8:
        return format("%d", v.SensorInt8);
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT16:
        return format("%d", v.SensorInt16);
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT32:
        return format("%" PRId32, v.SensorInt32);
    case SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32:
        return format("%.2f", static_cast<double>(v.SensorFloat32));
    case SAHPI_SENSOR_INTERPRETED_TYPE_BUFFER:
        return format("\"%.*s\"", SAHPI_SENSOR_BUFFER_LENGTH, v.SensorBuffer);
    }
    return "?";
}

std::string units(const SaHpiRdrT *Sensor)
{
    if (Sensor == nullptr || !Sensor->RdrTypeUnion.SensorRec.DataFormat.IsNumeric)
        return "";
    SaHpiSensorUnitsT base = Sensor->RdrTypeUnion.SensorRec.DataFormat.BaseUnits;
    const char *text = unitText(base);
    if (text != nullptr)
        return text;
    return " " + nameOr(kviShellSensorUnitsNames, base).substr(3); // after "SU_"
}

std::string yesNo(SaHpiBoolT Value)
{
    return Value ? "yes" : "no";
}

std::string bytes(const SaHpiUint8T *Data, size_t Length)
{
    std::string out;
    for (size_t i = 0; i < Length; i++)
        out += format(i ? " %02X" : "%02X", Data[i]);
    return out;
}

} // namespace

std::string kviShellErrorName(SaErrorT Rc)
{
    const char *name = kviShellNameOf(kviShellErrorNames, Rc);
    return name != nullptr ? name : format("error %" PRId32, Rc);
}

void kviShellPrintResult(const char *Call, SaErrorT Rc)
{
    printf("%s: %s%s\n", Call, kviShellErrorName(Rc).c_str(),
           Rc == SA_ERR_HPI_UNSUPPORTED_API && kviShellHpiUnserved ? ", not served by this library"
                                                                   : "");
}

std::string kviShellText(const SaHpiTextBufferT &Text)
{
    if (Text.DataType == SAHPI_TL_TYPE_BINARY)
        return "[" + bytes(Text.Data, Text.DataLength) + "]";
    return std::string(reinterpret_cast<const char *>(Text.Data), Text.DataLength);
}

void kviShellTextSet(SaHpiTextBufferT *Text, const char *Value)
{
    memset(Text, 0, sizeof *Text);
    Text->DataType = SAHPI_TL_TYPE_LANGUAGE;
    Text->Language = SAHPI_LANG_ENGLISH;
    size_t length = strnlen(Value, SAHPI_MAX_TEXT_BUFFER_LENGTH);
    memcpy(Text->Data, Value, length);
    Text->DataLength = static_cast<SaHpiUint8T>(length);
}

std::string kviShellTime(SaHpiTimeT Time)
{
    if (Time == SAHPI_TIME_UNSPECIFIED)
        return "unspecified";
    if (Time <= SAHPI_TIME_MAX_RELATIVE)
        return format("%" PRId64 ".%03" PRId64 " s after start", Time / 1000000000,
                      Time / 1000000 % 1000);
    time_t seconds = static_cast<time_t>(Time / 1000000000);
    struct tm local;
    char date[64];
    localtime_r(&seconds, &local);
    strftime(date, sizeof date, "%Y-%m-%d %H:%M:%S", &local);
    return format("%s.%03" PRId64, date, Time / 1000000 % 1000);
}

std::string kviShellEntityPath(const SaHpiEntityPathT &Path)
{
    int depth = 0;
    while (depth < SAHPI_MAX_ENTITY_PATH && Path.Entry[depth].EntityType != SAHPI_ENT_ROOT)
        depth++;
    std::string out;
    for (int i = depth - 1; i >= 0; i--)
        out += "{" + nameOr(kviShellEntityTypeNames, Path.Entry[i].EntityType).substr(4) + "," +
               std::to_string(Path.Entry[i].EntityInstance) + "}";
    return out.empty() ? "{ROOT,0}" : out;
}

bool kviShellEntityPathParse(const char *Text, SaHpiEntityPathT *Path)
{
    SaHpiEntityT entries[SAHPI_MAX_ENTITY_PATH];
    int depth = 0;
    while (*Text == '{') {
        char name[64];
        unsigned long instance = 0;
        int used = 0;
        if (depth == SAHPI_MAX_ENTITY_PATH ||
            sscanf(Text, "{%63[A-Za-z0-9_],%lu}%n", name, &instance, &used) != 2 || used == 0)
            return false;
        std::string full = std::string("ENT_") + name;
        long long type = 0;
        if (!kviShellValueOf(kviShellEntityTypeNames, full.c_str(), &type) || instance > UINT32_MAX)
            return false;
        entries[depth].EntityType = static_cast<SaHpiEntityTypeT>(type);
        entries[depth].EntityInstance = static_cast<SaHpiEntityInstanceT>(instance);
        depth++;
        Text += used;
    }
    if (*Text != '\0' || depth == 0)
        return false;
    memset(Path, 0, sizeof *Path);
    for (int i = 0; i < depth; i++)
        Path->Entry[i] = entries[depth - 1 - i];
    if (depth < SAHPI_MAX_ENTITY_PATH)
        Path->Entry[depth].EntityType = SAHPI_ENT_ROOT;
    return true;
}

std::string kviShellCapabilities(SaHpiCapabilitiesT Capabilities)
{
    static const struct {
        SaHpiCapabilitiesT Bit;
        const char *Name;
    } flags[] = {
        {SAHPI_CAPABILITY_SENSOR, "sensor"},
        {SAHPI_CAPABILITY_CONTROL, "control"},
        {SAHPI_CAPABILITY_INVENTORY_DATA, "inv"},
        {SAHPI_CAPABILITY_WATCHDOG, "wdt"},
        {SAHPI_CAPABILITY_SEL, "sel"},
        {SAHPI_CAPABILITY_FRU, "fru"},
        {SAHPI_CAPABILITY_MANAGED_HOTSWAP, "hs"},
        {SAHPI_CAPABILITY_CONFIGURATION, "cfg"},
        {SAHPI_CAPABILITY_AGGREGATE_STATUS, "aggr"},
        {SAHPI_CAPABILITY_EVT_DEASSERTS, "deassert"},
    };
    std::string out;
    for (const auto &flag : flags)
        if (Capabilities & flag.Bit)
            out += (out.empty() ? "" : ",") + std::string(flag.Name);
    return out.empty() ? "-" : out;
}

std::string kviShellEventStates(SaHpiEventStateT States, SaHpiEventCategoryT Category)
{
    long long category = Category == SAHPI_EC_USER ? SAHPI_EC_GENERIC : Category;
    std::string out;
    for (int bit = 0; bit < 16; bit++) {
        SaHpiEventStateT state = static_cast<SaHpiEventStateT>(1u << bit);
        const char *name = kviShellNameOf(kviShellEventStateNames, category << 16 | state);
        if (States & state)
            out += (out.empty() ? "" : "|") + (name ? std::string(name) : format("0x%04X", state));
    }
    return out.empty() ? "none" : out;
}

std::string kviShellReading(const SaHpiSensorReadingT &Reading, const SaHpiRdrT *Sensor)
{
    std::string out;
    if (Reading.ValuesPresent & SAHPI_SRF_INTERPRETED)
        out = interpreted(Reading.Interpreted) + units(Sensor);
    if (Reading.ValuesPresent & SAHPI_SRF_RAW)
        out += format(out.empty() ? "raw %" PRIu32 : " (raw %" PRIu32 ")", Reading.Raw);
    return out.empty() ? "-" : out;
}

void kviShellPrintRptHeader()
{
    printf("%-5s %-22s %-9s %-44s %s\n", "id", "tag", "severity", "capabilities", "entity path");
}

void kviShellPrintRptRow(const SaHpiRptEntryT &Entry)
{
    printf("%-5" PRIu32 " %-22s %-9s %-44s %s\n", Entry.ResourceId,
           kviShellText(Entry.ResourceTag).c_str(),
           nameOr(kviShellSeverityNames, Entry.ResourceSeverity).c_str(),
           kviShellCapabilities(Entry.ResourceCapabilities).c_str(),
           kviShellEntityPath(Entry.ResourceEntity).c_str());
}

void kviShellPrintRptEntry(const SaHpiRptEntryT &Entry)
{
    const SaHpiResourceInfoT &info = Entry.ResourceInfo;
    printf("resource %" PRIu32 ": %s\n", Entry.ResourceId, kviShellText(Entry.ResourceTag).c_str());
    printf("  entity path   %s\n", kviShellEntityPath(Entry.ResourceEntity).c_str());
    printf("  severity      %s\n", nameOr(kviShellSeverityNames, Entry.ResourceSeverity).c_str());
    printf("  capabilities  %s\n", kviShellCapabilities(Entry.ResourceCapabilities).c_str());
    printf("  manufacturer  %" PRIu32 ", product %u, revision %u, firmware %u.%u\n",
           info.ManufacturerId, info.ProductId, info.ResourceRev, info.FirmwareMajorRev,
           info.FirmwareMinorRev);
}

void kviShellPrintRdrHeader()
{
    printf("%-7s %-10s %-4s %s\n", "record", "type", "num", "name");
}

namespace
{

unsigned rdrNumber(const SaHpiRdrT &Rdr)
{
    switch (Rdr.RdrType) {
    case SAHPI_CTRL_RDR:
        return Rdr.RdrTypeUnion.CtrlRec.Num;
    case SAHPI_SENSOR_RDR:
        return Rdr.RdrTypeUnion.SensorRec.Num;
    case SAHPI_INVENTORY_RDR:
        return Rdr.RdrTypeUnion.InventoryRec.EirId;
    case SAHPI_WATCHDOG_RDR:
        return Rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
    default:
        return 0;
    }
}

std::string rdrType(SaHpiRdrTypeT Type)
{
    static const char *const names[] = {"none", "control", "sensor", "inventory", "watchdog"};
    return Type <= SAHPI_WATCHDOG_RDR ? names[Type] : nameOr(kviShellRdrTypeNames, Type);
}

void printSensorRec(const SaHpiSensorRecT &Rec)
{
    const SaHpiSensorDataFormatT &format = Rec.DataFormat;
    printf("  sensor type   %s, category %s\n", nameOr(kviShellSensorTypeNames, Rec.Type).c_str(),
           nameOr(kviShellEventCategoryNames, Rec.Category).c_str());
    printf("  events        %s\n", kviShellEventStates(Rec.Events, Rec.Category).c_str());
    printf("  numeric       %s, units %s\n", yesNo(format.IsNumeric).c_str(),
           nameOr(kviShellSensorUnitsNames, format.BaseUnits).c_str());
    printf("  thresholds    %s, readable 0x%02X, writable 0x%02X\n",
           yesNo(Rec.ThresholdDefn.IsThreshold).c_str(), Rec.ThresholdDefn.ReadThold,
           Rec.ThresholdDefn.WriteThold);
}

void printCtrlRec(const SaHpiCtrlRecT &Rec)
{
    printf("  control type  %s\n", nameOr(kviShellCtrlTypeNames, Rec.Type).c_str());
    if (Rec.Type == SAHPI_CTRL_TYPE_ANALOG)
        printf("  range         %" PRId32 " to %" PRId32 ", default %" PRId32 "\n",
               Rec.TypeUnion.Analog.Min, Rec.TypeUnion.Analog.Max, Rec.TypeUnion.Analog.Default);
    if (Rec.Type == SAHPI_CTRL_TYPE_TEXT)
        printf("  text          %u lines of %u characters\n", Rec.TypeUnion.Text.MaxLines,
               Rec.TypeUnion.Text.MaxChars);
}

} // namespace

void kviShellPrintRdrRow(const SaHpiRdrT &Rdr)
{
    printf("%-7" PRIu32 " %-10s %-4u %s\n", Rdr.RecordId, rdrType(Rdr.RdrType).c_str(),
           rdrNumber(Rdr), kviShellText(Rdr.IdString).c_str());
}

void kviShellPrintRdr(const SaHpiRdrT &Rdr)
{
    printf("record %" PRIu32 ": %s %u \"%s\"\n", Rdr.RecordId, rdrType(Rdr.RdrType).c_str(),
           rdrNumber(Rdr), kviShellText(Rdr.IdString).c_str());
    printf("  entity path   %s\n", kviShellEntityPath(Rdr.Entity).c_str());
    if (Rdr.RdrType == SAHPI_SENSOR_RDR)
        printSensorRec(Rdr.RdrTypeUnion.SensorRec);
    else if (Rdr.RdrType == SAHPI_CTRL_RDR)
        printCtrlRec(Rdr.RdrTypeUnion.CtrlRec);
}

void kviShellPrintThresholds(const SaHpiSensorThresholdsT &T, const SaHpiRdrT &Sensor)
{
    const struct {
        const char *Name;
        const SaHpiSensorReadingT &Value;
    } rows[] = {{"low-crit", T.LowCritical},      {"low-major", T.LowMajor},
                {"low-minor", T.LowMinor},        {"up-minor", T.UpMinor},
                {"up-major", T.UpMajor},          {"up-crit", T.UpCritical},
                {"pos-hyst", T.PosThdHysteresis}, {"neg-hyst", T.NegThdHysteresis}};
    for (const auto &row : rows)
        printf("  %-10s %s\n", row.Name, kviShellReading(row.Value, &Sensor).c_str());
}

void kviShellPrintCtrlState(const SaHpiCtrlStateT &State)
{
    const SaHpiCtrlStateUnionT &s = State.StateUnion;
    std::string type = nameOr(kviShellCtrlTypeNames, State.Type);
    switch (State.Type) {
    case SAHPI_CTRL_TYPE_DIGITAL:
        printf("%s %s\n", type.c_str(), nameOr(kviShellCtrlStateDigitalNames, s.Digital).c_str());
        break;
    case SAHPI_CTRL_TYPE_DISCRETE:
        printf("%s %" PRIu32 "\n", type.c_str(), s.Discrete);
        break;
    case SAHPI_CTRL_TYPE_ANALOG:
        printf("%s %" PRId32 "\n", type.c_str(), s.Analog);
        break;
    case SAHPI_CTRL_TYPE_STREAM:
        printf("%s repeat %s, [%s]\n", type.c_str(), yesNo(s.Stream.Repeat).c_str(),
               bytes(s.Stream.Stream, s.Stream.StreamLength < SAHPI_CTRL_MAX_STREAM_LENGTH
                                          ? s.Stream.StreamLength
                                          : SAHPI_CTRL_MAX_STREAM_LENGTH)
                   .c_str());
        break;
    case SAHPI_CTRL_TYPE_TEXT:
        printf("%s line %u \"%s\"\n", type.c_str(), s.Text.Line, kviShellText(s.Text.Text).c_str());
        break;
    default:
        printf("%s manufacturer %" PRIu32 ", [%s]\n", type.c_str(), s.Oem.MId,
               bytes(s.Oem.Body, s.Oem.BodyLength).c_str());
        break;
    }
}

namespace
{

void printGeneral(const SaHpiInventGeneralDataT &General)
{
    const struct {
        const char *Name;
        const SaHpiTextBufferT *Text;
    } fields[] = {{"manufacturer", General.Manufacturer},
                  {"product", General.ProductName},
                  {"version", General.ProductVersion},
                  {"model", General.ModelNumber},
                  {"serial", General.SerialNumber},
                  {"part", General.PartNumber},
                  {"file id", General.FileId},
                  {"asset tag", General.AssetTag}};
    printf("    %-13s %s\n", "made", kviShellTime(General.MfgDateTime).c_str());
    for (const auto &field : fields)
        if (field.Text != nullptr)
            printf("    %-13s %s\n", field.Name, kviShellText(*field.Text).c_str());
    for (int i = 0; General.CustomField[i] != nullptr; i++)
        printf("    %-13s %s\n", "custom", kviShellText(*General.CustomField[i]).c_str());
}

} // namespace

void kviShellPrintInventory(const SaHpiInventoryDataT &Data)
{
    printf("validity %s\n", Data.Validity == SAHPI_INVENT_DATA_VALID ? "valid" : "not valid");
    for (int i = 0; Data.DataRecords[i] != nullptr; i++) {
        const SaHpiInventDataRecordT &record = *Data.DataRecords[i];
        printf("  %s\n", nameOr(kviShellInventDataRecordTypeNames, record.RecordType).c_str());
        const SaHpiInventDataUnionT &u = record.RecordData;
        if (record.RecordType == SAHPI_INVENT_RECTYPE_CHASSIS_INFO) {
            printf("    %-13s %s\n", "chassis type",
                   nameOr(kviShellInventChassisTypeNames, u.ChassisInfo.Type).c_str());
            printGeneral(u.ChassisInfo.GeneralData);
        } else if (record.RecordType == SAHPI_INVENT_RECTYPE_BOARD_INFO) {
            printGeneral(u.BoardInfo);
        } else if (record.RecordType == SAHPI_INVENT_RECTYPE_PRODUCT_INFO) {
            printGeneral(u.ProductInfo);
        } else {
            printf("    %" PRIu32 " bytes\n", record.DataLength);
        }
    }
}

void kviShellPrintWatchdog(const SaHpiWatchdogT &W)
{
    printf("  running       %s, log %s\n", yesNo(W.Running).c_str(), yesNo(W.Log).c_str());
    printf("  use           %s, flags 0x%02X\n",
           nameOr(kviShellWatchdogTimerUseNames, W.TimerUse).c_str(), W.TimerUseExpFlags);
    printf("  action        %s, pre-timer %s after %" PRIu32 " ms\n",
           nameOr(kviShellWatchdogActionNames, W.TimerAction).c_str(),
           nameOr(kviShellWatchdogPretimerInterruptNames, W.PretimerInterrupt).c_str(),
           W.PreTimeoutInterval);
    printf("  count         %" PRIu32 " ms of %" PRIu32 " ms\n", W.PresentCount, W.InitialCount);
}

void kviShellPrintSelInfo(const SaHpiSelInfoT &Info)
{
    printf("  entries       %" PRIu32 " of %" PRIu32 "%s\n", Info.Entries, Info.Size,
           Info.OverflowFlag ? ", overflowed" : "");
    printf("  enabled       %s, on overflow %s, delete %s\n", yesNo(Info.Enabled).c_str(),
           nameOr(kviShellSelOverflowActionNames, Info.OverflowAction).c_str(),
           Info.DeleteEntrySupported ? "supported" : "not supported");
    printf("  updated       %s\n", kviShellTime(Info.UpdateTimestamp).c_str());
    printf("  clock         %s\n", kviShellTime(Info.CurrentTime).c_str());
}

namespace
{

std::string eventDetail(const SaHpiEventT &Event, const SaHpiRdrT *Rdr)
{
    const SaHpiEventUnionT &u = Event.EventDataUnion;
    switch (Event.EventType) {
    case SAHPI_ET_SENSOR: {
        const SaHpiSensorEventT &s = u.SensorEvent;
        std::string out = format("sensor %u %s %s", s.SensorNum,
                                 kviShellEventStates(s.EventState, s.EventCategory).c_str(),
                                 s.Assertion ? "asserted" : "deasserted");
        if (s.OptionalDataPresent & SAHPI_SOD_TRIGGER_READING)
            out += ", reading " + kviShellReading(s.TriggerReading, Rdr);
        if (s.OptionalDataPresent & SAHPI_SOD_TRIGGER_THRESHOLD)
            out += ", threshold " + kviShellReading(s.TriggerThreshold, Rdr);
        return out;
    }
    case SAHPI_ET_HOTSWAP:
        return "hot swap " + nameOr(kviShellHsStateNames, u.HotSwapEvent.PreviousHotSwapState) +
               " -> " + nameOr(kviShellHsStateNames, u.HotSwapEvent.HotSwapState);
    case SAHPI_ET_WATCHDOG:
        return format("watchdog %u ", u.WatchdogEvent.WatchdogNum) +
               nameOr(kviShellWatchdogActionEventNames, u.WatchdogEvent.WatchdogAction);
    case SAHPI_ET_USER:
        return format("user \"%.*s\"", SAHPI_USER_EVENT_DATA_SIZE, u.UserEvent.UserEventData);
    default:
        return nameOr(kviShellEventTypeNames, Event.EventType);
    }
}

} // namespace

void kviShellPrintEvent(const SaHpiEventT &Event, const SaHpiRdrT *Rdr, const SaHpiRptEntryT *Rpt)
{
    const SaHpiRdrT *sensor = Rdr != nullptr && Rdr->RdrType == SAHPI_SENSOR_RDR ? Rdr : nullptr;
    printf("%s  %-8s resource %" PRIu32 " %s", kviShellTime(Event.Timestamp).c_str(),
           nameOr(kviShellSeverityNames, Event.Severity).c_str(), Event.Source,
           eventDetail(Event, sensor).c_str());
    if (Rdr != nullptr && Rdr->RdrType != SAHPI_NO_RECORD)
        printf(" \"%s\"", kviShellText(Rdr->IdString).c_str());
    if (Rpt != nullptr && Rpt->ResourceCapabilities != 0)
        printf(" on \"%s\"", kviShellText(Rpt->ResourceTag).c_str());
    printf("\n");
}
