// What the simulated shelf is made of: one table of sensors, one of
// controls, and the list of records of each kind of resource. Changing the
// shelf means changing these tables only.
#include "SimModel.h"

namespace {

constexpr SaHpiEventStateT LOWER_ALL = SAHPI_ES_LOWER_MINOR | SAHPI_ES_LOWER_MAJOR |
                                       SAHPI_ES_LOWER_CRIT;
constexpr SaHpiEventStateT UPPER_ALL = SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR |
                                       SAHPI_ES_UPPER_CRIT;
constexpr SaHpiSensorThdMaskT HYSTERESIS = SAHPI_STM_UP_HYSTERESIS | SAHPI_STM_LOW_HYSTERESIS;
constexpr SaHpiSensorThdMaskT LOW_ALL = SAHPI_STM_LOW_MINOR | SAHPI_STM_LOW_MAJOR |
                                        SAHPI_STM_LOW_CRIT;
constexpr SaHpiSensorThdMaskT UP_ALL = SAHPI_STM_UP_MINOR | SAHPI_STM_UP_MAJOR |
                                       SAHPI_STM_UP_CRIT;
// Minor and major limits are the operator's to move; critical ones are fixed.
constexpr SaHpiSensorThdMaskT LOW_WRITABLE = SAHPI_STM_LOW_MINOR | SAHPI_STM_LOW_MAJOR;
constexpr SaHpiSensorThdMaskT UP_WRITABLE = SAHPI_STM_UP_MINOR | SAHPI_STM_UP_MAJOR;

// Thresholds are raw: LowCritical, LowMajor, LowMinor, UpCritical, UpMajor,
// UpMinor, positive and negative hysteresis. Unreadable ones are 0.
// Conversion: value = (M * raw + B * 10^ExpB) * 10^ExpR.

// degrees C = raw
const SimSensorShapeT InletTemperature = {
    "Inlet temperature", SAHPI_TEMPERATURE, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    LOWER_ALL | UPPER_ALL, SAHPI_TRUE, SAHPI_SU_DEGREES_C, 1, 0, 0, 0,
    SIM_SRC_FIXED, 25, 25,
    {5, 8, 10, 45, 40, 35, 2, 2},
    LOW_ALL | UP_ALL | HYSTERESIS, LOW_WRITABLE | UP_WRITABLE | HYSTERESIS,
    LOWER_ALL | UPPER_ALL, LOWER_ALL | UPPER_ALL};

const SimSensorShapeT ChassisIntrusion = {
    "Chassis intrusion", SAHPI_PHYSICAL_SECURITY, SAHPI_EC_STATE, SAHPI_SEC_PER_EVENT,
    SAHPI_ES_STATE_DEASSERTED | SAHPI_ES_STATE_ASSERTED, SAHPI_FALSE, SAHPI_SU_UNSPECIFIED,
    0, 0, 0, 0,
    SIM_SRC_INTRUSION, 0, 0,
    {0, 0, 0, 0, 0, 0, 0, 0},
    0, 0,
    SAHPI_ES_STATE_ASSERTED, SAHPI_ES_STATE_ASSERTED};

const SimSensorShapeT CpuTemperature = {
    "CPU temperature", SAHPI_TEMPERATURE, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    UPPER_ALL, SAHPI_TRUE, SAHPI_SU_DEGREES_C, 1, 0, 0, 0,
    SIM_SRC_POWERED, 45, 25,
    {0, 0, 0, 90, 80, 70, 2, 2},
    UP_ALL | HYSTERESIS, UP_WRITABLE | HYSTERESIS,
    UPPER_ALL, UPPER_ALL};

// volts = raw * 0.02
const SimSensorShapeT Board3V3 = {
    "Board 3.3V", SAHPI_VOLTAGE, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    LOWER_ALL | UPPER_ALL, SAHPI_TRUE, SAHPI_SU_VOLTS, 2, 0, -2, 0,
    SIM_SRC_POWERED, 165, 0,
    {149, 155, 157, 181, 175, 172, 1, 1},
    LOW_ALL | UP_ALL | HYSTERESIS, LOW_WRITABLE | UP_WRITABLE | HYSTERESIS,
    LOWER_ALL | UPPER_ALL, LOWER_ALL | UPPER_ALL};

// volts = raw * 0.06
const SimSensorShapeT Board12V = {
    "Board 12V", SAHPI_VOLTAGE, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    LOWER_ALL | UPPER_ALL, SAHPI_TRUE, SAHPI_SU_VOLTS, 6, 0, -2, 0,
    SIM_SRC_POWERED, 200, 0,
    {180, 190, 193, 220, 210, 207, 1, 1},
    LOW_ALL | UP_ALL | HYSTERESIS, LOW_WRITABLE | UP_WRITABLE | HYSTERESIS,
    LOWER_ALL | UPPER_ALL, LOWER_ALL | UPPER_ALL};

// RPM = raw * 50; the fan-speed control sets raw = percent * 8 / 5.
const SimSensorShapeT FanSpeed = {
    "Fan %u speed", SAHPI_FAN, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    LOWER_ALL, SAHPI_TRUE, SAHPI_SU_RPM, 50, 0, 0, 0,
    SIM_SRC_FAN, 96, 0,
    {20, 30, 40, 0, 0, 0, 2, 2},
    LOW_ALL | HYSTERESIS, LOW_WRITABLE | HYSTERESIS,
    LOWER_ALL, LOWER_ALL};

const SimSensorShapeT SupplyOutput = {
    "Output 12V", SAHPI_VOLTAGE, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    LOWER_ALL | UPPER_ALL, SAHPI_TRUE, SAHPI_SU_VOLTS, 6, 0, -2, 0,
    SIM_SRC_POWERED, 200, 0,
    {180, 190, 193, 220, 210, 207, 1, 1},
    LOW_ALL | UP_ALL | HYSTERESIS, LOW_WRITABLE | UP_WRITABLE | HYSTERESIS,
    LOWER_ALL | UPPER_ALL, LOWER_ALL | UPPER_ALL};

const SimSensorShapeT SupplyTemperature = {
    "Supply temperature", SAHPI_TEMPERATURE, SAHPI_EC_THRESHOLD, SAHPI_SEC_PER_EVENT,
    UPPER_ALL, SAHPI_TRUE, SAHPI_SU_DEGREES_C, 1, 0, 0, 0,
    SIM_SRC_POWERED, 40, 25,
    {0, 0, 0, 80, 70, 60, 2, 2},
    UP_ALL | HYSTERESIS, UP_WRITABLE | HYSTERESIS,
    UPPER_ALL, UPPER_ALL};

const SimSensorShapeT SupplyStatus = {
    "Supply status", SAHPI_POWER_SUPPLY, SAHPI_EC_AVAILABILITY, SAHPI_SEC_PER_EVENT,
    SAHPI_ES_RUNNING | SAHPI_ES_POWER_OFF, SAHPI_FALSE, SAHPI_SU_UNSPECIFIED, 0, 0, 0, 0,
    SIM_SRC_AVAILABILITY, 0, 0,
    {0, 0, 0, 0, 0, 0, 0, 0},
    0, 0,
    SAHPI_ES_RUNNING | SAHPI_ES_POWER_OFF, 0};

// Controls: one of every type on the chassis, and one that acts on the
// readings on each other resource.
const SimControlShapeT AlarmLed = {"Alarm LED", SAHPI_CTRL_TYPE_DIGITAL, SAHPI_CTRL_LED,
                                   SIM_CTRL_PLAIN, 0, 0, SAHPI_CTRL_STATE_OFF, nullptr, 0};
const SimControlShapeT OperatingMode = {"Operating mode", SAHPI_CTRL_TYPE_DISCRETE,
                                        SAHPI_CTRL_GENERIC, SIM_CTRL_PLAIN, 0, 0, 1, nullptr, 0};
const SimControlShapeT DisplayBrightness = {"Display brightness", SAHPI_CTRL_TYPE_ANALOG,
                                            SAHPI_CTRL_GENERIC, SIM_CTRL_PLAIN, 0, 100, 75,
                                            nullptr, 0};
const SimControlShapeT BuzzerPattern = {"Buzzer pattern", SAHPI_CTRL_TYPE_STREAM,
                                        SAHPI_CTRL_AUDIBLE, SIM_CTRL_PLAIN, 0, 0, 0,
                                        "\x01\x00", 2};
const SimControlShapeT FrontPanel = {"Front panel display", SAHPI_CTRL_TYPE_TEXT,
                                     SAHPI_CTRL_LCD_DISPLAY, SIM_CTRL_PLAIN, 0, 0, 0,
                                     "Kvi simulator   shelf ready", 0};
const SimControlShapeT OemSettings = {"OEM settings", SAHPI_CTRL_TYPE_OEM, SAHPI_CTRL_OEM,
                                      SIM_CTRL_PLAIN, 0, 0, 0, "\x01\x02\x03", 3};
const SimControlShapeT HealthLed = {"Health LED", SAHPI_CTRL_TYPE_DIGITAL, SAHPI_CTRL_LED,
                                    SIM_CTRL_PLAIN, 0, 0, SAHPI_CTRL_STATE_ON, nullptr, 0};
const SimControlShapeT FanControl = {"Fan speed", SAHPI_CTRL_TYPE_ANALOG, SAHPI_CTRL_FAN_SPEED,
                                     SIM_CTRL_FAN_SPEED, 20, 100, 60, nullptr, 0};
const SimControlShapeT PowerInhibit = {"Power inhibit", SAHPI_CTRL_TYPE_DIGITAL,
                                       SAHPI_CTRL_POWER_SUPPLY_INHIBIT, SIM_CTRL_POWER_INHIBIT,
                                       0, 0, SAHPI_CTRL_STATE_OFF, nullptr, 0};

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
    {SAHPI_SENSOR_RDR, &CpuTemperature, SAHPI_FALSE},
    {SAHPI_SENSOR_RDR, &Board3V3, SAHPI_FALSE},
    {SAHPI_SENSOR_RDR, &Board12V, SAHPI_FALSE},
    {SAHPI_CTRL_RDR, &HealthLed, SAHPI_FALSE},
    {SAHPI_INVENTORY_RDR, nullptr, SAHPI_FALSE},
    {SAHPI_WATCHDOG_RDR, nullptr, SAHPI_FALSE},
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

template <size_t N> constexpr SaHpiUint32T count(const SimRecordShapeT (&)[N])
{
    return static_cast<SaHpiUint32T>(N);
}

const SimResourceShapeT ResourceShapes[SIM_KIND_COUNT] = {
    {SIM_CHASSIS, "Chassis %u", SAHPI_ENT_SYSTEM_CHASSIS, COMMON_CAPABILITIES, SAHPI_CRITICAL,
     ChassisRecords, count(ChassisRecords)},
    {SIM_PROCESSOR_BOARD, "Processor board %u", SAHPI_ENT_PROCESSOR_BOARD,
     COMMON_CAPABILITIES | SAHPI_CAPABILITY_WATCHDOG | SAHPI_CAPABILITY_FRU, SAHPI_MAJOR,
     BoardRecords, count(BoardRecords)},
    {SIM_FAN_TRAY, "Fan tray %u", SAHPI_ENT_COOLING_UNIT,
     COMMON_CAPABILITIES | SAHPI_CAPABILITY_FRU, SAHPI_MAJOR, FanTrayRecords,
     count(FanTrayRecords)},
    {SIM_POWER_SUPPLY, "Power supply %u", SAHPI_ENT_POWER_SUPPLY,
     COMMON_CAPABILITIES | SAHPI_CAPABILITY_FRU, SAHPI_CRITICAL, SupplyRecords,
     count(SupplyRecords)},
};

} // namespace

const SimResourceShapeT *simResourceShape(SimKindT Kind) noexcept
{
    return &ResourceShapes[Kind];
}
