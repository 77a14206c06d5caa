// What the simulated shelf is made of: one table of sensors, one of
// controls, and the list of records of each kind of resource. Changing the
// shelf means changing these tables only.
#include "SimModel.h"

namespace
{

constexpr SaHpiEventStateT LOWER_ALL =
    SAHPI_ES_LOWER_MINOR | SAHPI_ES_LOWER_MAJOR | SAHPI_ES_LOWER_CRIT;
constexpr SaHpiEventStateT UPPER_ALL =
    SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR | SAHPI_ES_UPPER_CRIT;
constexpr SaHpiSensorThdMaskT HYSTERESIS = SAHPI_STM_UP_HYSTERESIS | SAHPI_STM_LOW_HYSTERESIS;
constexpr SaHpiSensorThdMaskT LOW_ALL =
    SAHPI_STM_LOW_MINOR | SAHPI_STM_LOW_MAJOR | SAHPI_STM_LOW_CRIT;
constexpr SaHpiSensorThdMaskT UP_ALL = SAHPI_STM_UP_MINOR | SAHPI_STM_UP_MAJOR | SAHPI_STM_UP_CRIT;
// Minor and major limits are the operator's to move; critical ones are fixed.
constexpr SaHpiSensorThdMaskT LOW_WRITABLE = SAHPI_STM_LOW_MINOR | SAHPI_STM_LOW_MAJOR;
constexpr SaHpiSensorThdMaskT UP_WRITABLE = SAHPI_STM_UP_MINOR | SAHPI_STM_UP_MAJOR;

// A threshold sensor is evented state by state on the sides it watches
// (Events: the lower states, the upper ones or both): it reads all limits of
// those sides and both hysteresis values, and lets the operator move the
// minor and major limits and the hysteresis; the critical ones are fixed.
constexpr SimSensorShapeT thresholdSensor(SimSensorShapeT S)
{
    const bool low = (S.Events & LOWER_ALL) != 0;
    const bool up = (S.Events & UPPER_ALL) != 0;
    S.Category = SAHPI_EC_THRESHOLD;
    S.EventCtrl = SAHPI_SEC_PER_EVENT;
    S.IsThreshold = SAHPI_TRUE;
    S.ReadThold = (low ? LOW_ALL : 0) | (up ? UP_ALL : 0) | HYSTERESIS;
    S.WriteThold = (low ? LOW_WRITABLE : 0) | (up ? UP_WRITABLE : 0) | HYSTERESIS;
    S.AssertEvents = S.Events;
    S.DeassertEvents = S.Events;
    return S;
}

// Thresholds are raw: LowCritical, LowMajor, LowMinor, UpCritical, UpMajor,
// UpMinor, positive and negative hysteresis. Unreadable ones are 0.
// Conversion: value = (M * raw + B * 10^ExpB) * 10^ExpR.

// degrees C = raw
constexpr SimSensorShapeT InletTemperature = thresholdSensor({
    .IdString = "Inlet temperature",
    .Type = SAHPI_TEMPERATURE,
    .Events = LOWER_ALL | UPPER_ALL,
    .Units = SAHPI_SU_DEGREES_C,
    .M = 1,
    .Source = SIM_SRC_FIXED,
    .NominalRaw = 25,
    .OffRaw = 25,
    .Thresholds = {5, 8, 10, 45, 40, 35, 2, 2},
});

constexpr SimSensorShapeT CpuTemperature = thresholdSensor({
    .IdString = "CPU temperature",
    .Type = SAHPI_TEMPERATURE,
    .Events = UPPER_ALL,
    .Units = SAHPI_SU_DEGREES_C,
    .M = 1,
    .Source = SIM_SRC_POWERED,
    .NominalRaw = 45,
    .OffRaw = 25,
    .Thresholds = {0, 0, 0, 90, 80, 70, 2, 2},
});

// volts = raw * 0.02
constexpr SimSensorShapeT Board3V3 = thresholdSensor({
    .IdString = "Board 3.3V",
    .Type = SAHPI_VOLTAGE,
    .Events = LOWER_ALL | UPPER_ALL,
    .Units = SAHPI_SU_VOLTS,
    .M = 2,
    .ExpR = -2,
    .Source = SIM_SRC_POWERED,
    .NominalRaw = 165,
    .Thresholds = {149, 155, 157, 181, 175, 172, 1, 1},
});

// volts = raw * 0.06; the supply's output is the same 12 V rail.
constexpr SimSensorShapeT Board12V = thresholdSensor({
    .IdString = "Board 12V",
    .Type = SAHPI_VOLTAGE,
    .Events = LOWER_ALL | UPPER_ALL,
    .Units = SAHPI_SU_VOLTS,
    .M = 6,
    .ExpR = -2,
    .Source = SIM_SRC_POWERED,
    .NominalRaw = 200,
    .Thresholds = {180, 190, 193, 220, 210, 207, 1, 1},
});

constexpr SimSensorShapeT named(SimSensorShapeT S, const char *IdString)
{
    S.IdString = IdString;
    return S;
}

constexpr SimSensorShapeT SupplyOutput = named(Board12V, "Output 12V");

// RPM = raw * 50; the fan-speed control sets raw = percent * 8 / 5.
constexpr SimSensorShapeT FanSpeed = thresholdSensor({
    .IdString = "Fan %u speed",
    .Type = SAHPI_FAN,
    .Events = LOWER_ALL,
    .Units = SAHPI_SU_RPM,
    .M = 50,
    .Source = SIM_SRC_FAN,
    .NominalRaw = 96,
    .Thresholds = {20, 30, 40, 0, 0, 0, 2, 2},
});

constexpr SimSensorShapeT SupplyTemperature = thresholdSensor({
    .IdString = "Supply temperature",
    .Type = SAHPI_TEMPERATURE,
    .Events = UPPER_ALL,
    .Units = SAHPI_SU_DEGREES_C,
    .M = 1,
    .Source = SIM_SRC_POWERED,
    .NominalRaw = 40,
    .OffRaw = 25,
    .Thresholds = {0, 0, 0, 80, 70, 60, 2, 2},
});

const SimSensorShapeT ChassisIntrusion = {
    .IdString = "Chassis intrusion",
    .Type = SAHPI_PHYSICAL_SECURITY,
    .Category = SAHPI_EC_STATE,
    .EventCtrl = SAHPI_SEC_PER_EVENT,
    .Events = SAHPI_ES_STATE_DEASSERTED | SAHPI_ES_STATE_ASSERTED,
    .Units = SAHPI_SU_UNSPECIFIED,
    .Source = SIM_SRC_INTRUSION,
    .AssertEvents = SAHPI_ES_STATE_ASSERTED,
    .DeassertEvents = SAHPI_ES_STATE_ASSERTED,
};

const SimSensorShapeT SupplyStatus = {
    .IdString = "Supply status",
    .Type = SAHPI_POWER_SUPPLY,
    .Category = SAHPI_EC_AVAILABILITY,
    .EventCtrl = SAHPI_SEC_PER_EVENT,
    .Events = SAHPI_ES_RUNNING | SAHPI_ES_POWER_OFF,
    .Units = SAHPI_SU_UNSPECIFIED,
    .Source = SIM_SRC_AVAILABILITY,
    .AssertEvents = SAHPI_ES_RUNNING | SAHPI_ES_POWER_OFF,
};

// Controls: one of every type on the chassis, and one that acts on the
// readings on each other resource.
const SimControlShapeT AlarmLed = {
    .IdString = "Alarm LED",
    .Type = SAHPI_CTRL_TYPE_DIGITAL,
    .OutputType = SAHPI_CTRL_LED,
    .Default = SAHPI_CTRL_STATE_OFF,
};
const SimControlShapeT OperatingMode = {
    .IdString = "Operating mode",
    .Type = SAHPI_CTRL_TYPE_DISCRETE,
    .OutputType = SAHPI_CTRL_GENERIC,
    .Default = 1,
};
const SimControlShapeT DisplayBrightness = {
    .IdString = "Display brightness",
    .Type = SAHPI_CTRL_TYPE_ANALOG,
    .OutputType = SAHPI_CTRL_GENERIC,
    .Max = 100,
    .Default = 75,
};
const SimControlShapeT BuzzerPattern = {
    .IdString = "Buzzer pattern",
    .Type = SAHPI_CTRL_TYPE_STREAM,
    .OutputType = SAHPI_CTRL_AUDIBLE,
    .Text = "\x01\x00",
    .Length = 2,
};
const SimControlShapeT FrontPanel = {
    .IdString = "Front panel display",
    .Type = SAHPI_CTRL_TYPE_TEXT,
    .OutputType = SAHPI_CTRL_LCD_DISPLAY,
    .Text = "Kvi simulator   shelf ready",
};
const SimControlShapeT OemSettings = {
    .IdString = "OEM settings",
    .Type = SAHPI_CTRL_TYPE_OEM,
    .OutputType = SAHPI_CTRL_OEM,
    .Text = "\x01\x02\x03",
    .Length = 3,
};
const SimControlShapeT HealthLed = {
    .IdString = "Health LED",
    .Type = SAHPI_CTRL_TYPE_DIGITAL,
    .OutputType = SAHPI_CTRL_LED,
    .Default = SAHPI_CTRL_STATE_ON,
};
const SimControlShapeT FanControl = {
    .IdString = "Fan speed",
    .Type = SAHPI_CTRL_TYPE_ANALOG,
    .OutputType = SAHPI_CTRL_FAN_SPEED,
    .Role = SIM_CTRL_FAN_SPEED,
    .Min = 20,
    .Max = 100,
    .Default = 60,
};
const SimControlShapeT PowerInhibit = {
    .IdString = "Power inhibit",
    .Type = SAHPI_CTRL_TYPE_DIGITAL,
    .OutputType = SAHPI_CTRL_POWER_SUPPLY_INHIBIT,
    .Role = SIM_CTRL_POWER_INHIBIT,
    .Default = SAHPI_CTRL_STATE_OFF,
};

const SimRecordShapeT ChassisRecords[] = {
    {SAHPI_SENSOR_RDR, &InletTemperature, SAHPI_FALSE},
    {SAHPI_SENSOR_RDR, &ChassisIntrusion, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &AlarmLed, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &OperatingMode, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &DisplayBrightness, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &BuzzerPattern, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &FrontPanel, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &OemSettings, SAHPI_FALSE},
    {SAHPI_INVENTORY_RDR, nullptr, SAHPI_FALSE},
};

const SimRecordShapeT BoardRecords[] = {
    {SAHPI_SENSOR_RDR, &CpuTemperature, SAHPI_FALSE}, {SAHPI_SENSOR_RDR, &Board3V3, SAHPI_FALSE},
    {SAHPI_SENSOR_RDR, &Board12V, SAHPI_FALSE},       {SAHPI_CTRL_RDR, &HealthLed, SAHPI_FALSE},
    {SAHPI_INVENTORY_RDR, nullptr, SAHPI_FALSE},      {SAHPI_WATCHDOG_RDR, nullptr, SAHPI_FALSE},
};

const SimRecordShapeT FanTrayRecords[] = {
    {SAHPI_SENSOR_RDR, &FanSpeed, SAHPI_TRUE},
    {SAHPI_CTRL_RDR, &FanControl, SAHPI_FALSE},
    {SAHPI_INVENTORY_RDR, nullptr, SAHPI_FALSE},
};

const SimRecordShapeT SupplyRecords[] = {
    {SAHPI_SENSOR_RDR, &SupplyOutput, SAHPI_FALSE},
    {SAHPI_SENSOR_RDR, &SupplyTemperature, SAHPI_FALSE},
    {SAHPI_SENSOR_RDR, &SupplyStatus, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &PowerInhibit, SAHPI_FALSE},
    {SAHPI_INVENTORY_RDR, nullptr, SAHPI_FALSE},
};

constexpr SaHpiCapabilitiesT COMMON_CAPABILITIES =
    SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_RDR | SAHPI_CAPABILITY_SENSOR |
    SAHPI_CAPABILITY_CONTROL | SAHPI_CAPABILITY_INVENTORY_DATA | SAHPI_CAPABILITY_SEL |
    SAHPI_CAPABILITY_CONFIGURATION | SAHPI_CAPABILITY_EVT_DEASSERTS;
// Boards, fan trays and supplies are pulled and inserted under a client's
// control: the managed hot-swap model.
constexpr SaHpiCapabilitiesT FRU_CAPABILITIES =
    SAHPI_CAPABILITY_FRU | SAHPI_CAPABILITY_MANAGED_HOTSWAP;

template <size_t N> constexpr SaHpiUint32T count(const SimRecordShapeT (&)[N])
{
    return static_cast<SaHpiUint32T>(N);
}

const SimResourceShapeT ResourceShapes[SIM_KIND_COUNT] = {
    {SIM_CHASSIS, "Chassis %u", SAHPI_ENT_SYSTEM_CHASSIS, COMMON_CAPABILITIES, SAHPI_CRITICAL,
     ChassisRecords, count(ChassisRecords)},
    {SIM_PROCESSOR_BOARD, "Processor board %u", SAHPI_ENT_PROCESSOR_BOARD,
     COMMON_CAPABILITIES | SAHPI_CAPABILITY_WATCHDOG | FRU_CAPABILITIES, SAHPI_MAJOR, BoardRecords,
     count(BoardRecords)},
    {SIM_FAN_TRAY, "Fan tray %u", SAHPI_ENT_COOLING_UNIT, COMMON_CAPABILITIES | FRU_CAPABILITIES,
     SAHPI_MAJOR, FanTrayRecords, count(FanTrayRecords)},
    {SIM_POWER_SUPPLY, "Power supply %u", SAHPI_ENT_POWER_SUPPLY,
     COMMON_CAPABILITIES | FRU_CAPABILITIES, SAHPI_CRITICAL, SupplyRecords, count(SupplyRecords)},
};

} // namespace

const SimResourceShapeT *simResourceShape(SimKindT Kind) noexcept
{
    return &ResourceShapes[Kind];
}
