// Sensors: readings computed from the resource's state, conversion through
// the record's factors, thresholds with hysteresis, event enables, the events
// of state changes and the active-alarm translation.
#include <cstring>

#include "KviSimulator.h"
#include "SimModel.h"

namespace
{

constexpr SaHpiUint32T RAW_MAX = 255;
constexpr SaHpiUint32T POS_HYSTERESIS = 6;
constexpr SaHpiUint32T NEG_HYSTERESIS = 7;

// Threshold i of SaHpiSensorThresholdsT order, its mask bit and the event
// state that its crossing asserts.
constexpr SaHpiSensorThdMaskT ThresholdMask[8] = {
    SAHPI_STM_LOW_CRIT, SAHPI_STM_LOW_MAJOR, SAHPI_STM_LOW_MINOR,     SAHPI_STM_UP_CRIT,
    SAHPI_STM_UP_MAJOR, SAHPI_STM_UP_MINOR,  SAHPI_STM_UP_HYSTERESIS, SAHPI_STM_LOW_HYSTERESIS};
constexpr SaHpiEventStateT ThresholdState[6] = {SAHPI_ES_LOWER_CRIT,  SAHPI_ES_LOWER_MAJOR,
                                                SAHPI_ES_LOWER_MINOR, SAHPI_ES_UPPER_CRIT,
                                                SAHPI_ES_UPPER_MAJOR, SAHPI_ES_UPPER_MINOR};

SaHpiSensorReadingT *thresholdField(SaHpiSensorThresholdsT *T, SaHpiUint32T I) noexcept
{
    SaHpiSensorReadingT *fields[8] = {&T->LowCritical,      &T->LowMajor,        &T->LowMinor,
                                      &T->UpCritical,       &T->UpMajor,         &T->UpMinor,
                                      &T->PosThdHysteresis, &T->NegThdHysteresis};
    return fields[I];
}

double power10(SaHpiInt8T Exp) noexcept
{
    double result = 1.0;
    for (SaHpiInt8T i = 0; i < Exp; i++) {
        result *= 10.0;
    }
    for (SaHpiInt8T i = 0; i > Exp; i--) {
        result /= 10.0;
    }
    return result;
}

// value = (M * raw + B * 10^ExpB) * 10^ExpR; a hysteresis is a difference of
// readings, so its offset cancels out.
double toValue(const SimSensorShapeT *S, SaHpiUint32T Raw, bool Offset) noexcept
{
    double b = Offset ? S->B * power10(S->ExpB) : 0.0;
    return (S->M * static_cast<double>(Raw) + b) * power10(S->ExpR);
}

SaErrorT toRaw(const SimSensorShapeT *S, double Value, bool Offset, SaHpiUint32T *Raw) noexcept
{
    if (S->M == 0) {
        return SA_ERR_HPI_INVALID_CMD;
    }
    double b = Offset ? S->B * power10(S->ExpB) : 0.0;
    double raw = (Value / power10(S->ExpR) - b) / S->M;
    if (!(raw > -0.5 && raw < RAW_MAX + 0.5)) { // also refuses NaN
        return SA_ERR_HPI_INVALID_DATA;
    }
    *Raw = static_cast<SaHpiUint32T>(raw + 0.5);
    return SA_OK;
}

bool interpretedValue(const SaHpiSensorInterpretedT *I, double *Value) noexcept
{
    switch (simRaw(I->Type)) {
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT8:
        *Value = I->Value.SensorUint8;
        return true;
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT16:
        *Value = I->Value.SensorUint16;
        return true;
    case SAHPI_SENSOR_INTERPRETED_TYPE_UINT32:
        *Value = I->Value.SensorUint32;
        return true;
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT8:
        *Value = I->Value.SensorInt8;
        return true;
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT16:
        *Value = I->Value.SensorInt16;
        return true;
    case SAHPI_SENSOR_INTERPRETED_TYPE_INT32:
        *Value = I->Value.SensorInt32;
        return true;
    case SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32:
        *Value = I->Value.SensorFloat32;
        return true;
    default:
        return false;
    }
}

// A raw value of a reading or threshold given by a client: the interpreted
// form wins when both are present.
SaErrorT rawOf(const SimSensorShapeT *S, const SaHpiSensorReadingT *R, bool Offset,
               SaHpiUint32T *Raw) noexcept
{
    if (R->ValuesPresent & SAHPI_SRF_INTERPRETED) {
        double value = 0.0;
        if (!interpretedValue(&R->Interpreted, &value)) {
            return SA_ERR_HPI_INVALID_DATA;
        }
        return toRaw(S, value, Offset, Raw);
    }
    if (R->ValuesPresent & SAHPI_SRF_RAW) {
        if (R->Raw > RAW_MAX) {
            return SA_ERR_HPI_INVALID_DATA;
        }
        *Raw = R->Raw;
        return SA_OK;
    }
    return SA_ERR_HPI_INVALID_PARAMS;
}

void numericReading(const SimSensorShapeT *S, SaHpiUint32T Raw, bool Offset,
                    SaHpiSensorReadingT *R) noexcept
{
    memset(R, 0, sizeof(*R));
    R->ValuesPresent = SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED;
    R->Raw = Raw;
    R->Interpreted.Type = SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32;
    R->Interpreted.Value.SensorFloat32 = static_cast<SaHpiFloat32T>(toValue(S, Raw, Offset));
}

SaHpiUint32T rawReading(const SimRecordT *Record) noexcept
{
    const SimResourceT *resource = Record->Resource;
    const SimSensorShapeT *s = Record->Sensor.Shape;
    if (Record->Sensor.Driven) {
        return Record->Sensor.DrivenRaw;
    }
    switch (s->Source) {
    case SIM_SRC_POWERED:
        return simIsRunning(resource) ? s->NominalRaw : s->OffRaw;
    case SIM_SRC_FAN: {
        const SimRecordT *control = simFindControl(resource, SIM_CTRL_FAN_SPEED);
        if (!simIsRunning(resource) || control == nullptr) {
            return s->OffRaw;
        }
        SaHpiInt32T percent = control->Control.State.StateUnion.Analog;
        return percent <= 0 ? 0 : static_cast<SaHpiUint32T>(percent) * 8 / 5;
    }
    default:
        return s->NominalRaw;
    }
}

// The event state for a raw reading. An asserted threshold state stays
// asserted until the reading has moved back past the threshold by the
// hysteresis, so a reading on the limit does not chatter.
SaHpiEventStateT stateOf(const SimRecordT *Record, SaHpiUint32T Raw) noexcept
{
    const SimSensorStateT &st = Record->Sensor;
    const SimSensorShapeT *s = st.Shape;
    if (!s->IsThreshold) {
        switch (s->Source) {
        case SIM_SRC_AVAILABILITY:
            return simIsRunning(Record->Resource) ? SAHPI_ES_RUNNING : SAHPI_ES_POWER_OFF;
        case SIM_SRC_INTRUSION:
            return SAHPI_ES_STATE_DEASSERTED;
        default:
            return 0;
        }
    }
    SaHpiInt64T raw = Raw;
    SaHpiInt64T up = st.Valid[POS_HYSTERESIS] ? st.Raw[POS_HYSTERESIS] : 0;
    SaHpiInt64T down = st.Valid[NEG_HYSTERESIS] ? st.Raw[NEG_HYSTERESIS] : 0;
    SaHpiEventStateT state = 0;
    for (SaHpiUint32T i = 0; i < 6; i++) {
        if (!st.Valid[i]) {
            continue;
        }
        SaHpiInt64T limit = st.Raw[i];
        bool wasSet = (st.State & ThresholdState[i]) != 0;
        bool set = i < 3 ? (wasSet ? raw < limit + up : raw < limit)
                         : (wasSet ? raw > limit - down : raw > limit);
        if (set) {
            state |= ThresholdState[i];
        }
    }
    return state;
}

SaHpiSeverityT severityOf(const SimSensorShapeT *S, SaHpiEventStateT Bit) noexcept
{
    if (S->Category == SAHPI_EC_THRESHOLD) {
        if (Bit & (SAHPI_ES_LOWER_CRIT | SAHPI_ES_UPPER_CRIT)) {
            return SAHPI_CRITICAL;
        }
        if (Bit & (SAHPI_ES_LOWER_MAJOR | SAHPI_ES_UPPER_MAJOR)) {
            return SAHPI_MAJOR;
        }
        return SAHPI_MINOR;
    }
    if ((S->Category == SAHPI_EC_AVAILABILITY && Bit == SAHPI_ES_POWER_OFF) ||
        (S->Category == SAHPI_EC_STATE && Bit == SAHPI_ES_STATE_ASSERTED)) {
        return SAHPI_MAJOR;
    }
    return SAHPI_INFORMATIONAL;
}

// The states that count as an alarm: every threshold crossing, a supply
// that is off, an open lid.
SaHpiEventStateT alarmsOf(const SimSensorShapeT *S, SaHpiEventStateT State) noexcept
{
    switch (S->Category) {
    case SAHPI_EC_THRESHOLD:
        return State & (0x3F);
    case SAHPI_EC_AVAILABILITY:
        return State & SAHPI_ES_POWER_OFF;
    case SAHPI_EC_STATE:
        return State & SAHPI_ES_STATE_ASSERTED;
    default:
        return 0;
    }
}

// The threshold whose crossing asserts Bit, for the event's trigger.
SaHpiUint32T thresholdIndexOf(SaHpiEventStateT Bit) noexcept
{
    for (SaHpiUint32T i = 0; i < 6; i++) {
        if (ThresholdState[i] == Bit) {
            return i;
        }
    }
    return 0;
}

void sensorEvent(const SimRecordT *Record, SaHpiUint32T Raw, SaHpiEventStateT Bit,
                 SaHpiBoolT Assertion, SaHpiEventStateT Previous, SaHpiEventT *Event) noexcept
{
    const SimSensorShapeT *s = Record->Sensor.Shape;
    memset(Event, 0, sizeof(*Event));
    Event->Source = Record->Resource->ResourceId;
    Event->EventType = SAHPI_ET_SENSOR;
    Event->Timestamp = simNow();
    Event->Severity = Assertion ? severityOf(s, Bit) : SAHPI_INFORMATIONAL;
    SaHpiSensorEventT &e = Event->EventDataUnion.SensorEvent;
    e.SensorNum = Record->Num;
    e.SensorType = s->Type;
    e.EventCategory = s->Category;
    e.Assertion = Assertion;
    e.EventState = Bit;
    e.PreviousState = Previous;
    e.OptionalDataPresent = SAHPI_SOD_PREVIOUS_STATE;
    if (s->IsThreshold) {
        e.OptionalDataPresent |= SAHPI_SOD_TRIGGER_READING | SAHPI_SOD_TRIGGER_THRESHOLD;
        numericReading(s, Raw, true, &e.TriggerReading);
        SaHpiUint32T t = thresholdIndexOf(Bit);
        numericReading(s, Record->Sensor.Raw[t], true, &e.TriggerThreshold);
    }
}

// Brings the sensor's event state up to date and publishes what changed and
// is enabled. Records of a resource not yet in the table publish nothing.
SaHpiUint32T evaluate(SimRecordT *Record) noexcept
{
    SimSensorStateT &st = Record->Sensor;
    SaHpiUint32T raw = rawReading(Record);
    SaHpiEventStateT previous = st.State;
    SaHpiEventStateT now = stateOf(Record, raw);
    st.State = now;
    SaHpiEventStateT changed = previous ^ now;
    if (changed == 0 || Record->Resource->ResourceId == 0 ||
        !(st.Enables.SensorStatus & SAHPI_SENSTAT_EVENTS_ENABLED) ||
        st.Shape->EventCtrl == SAHPI_SEC_NO_EVENTS) {
        return raw;
    }
    for (SaHpiEventStateT bit = 1; bit != 0 && bit <= 0x4000;
         bit = static_cast<SaHpiEventStateT>(bit << 1)) {
        if (!(changed & bit)) {
            continue;
        }
        SaHpiBoolT assertion = (now & bit) ? SAHPI_TRUE : SAHPI_FALSE;
        SaHpiEventStateT enabled = assertion ? st.Enables.AssertEvents : st.Enables.DeassertEvents;
        if (!(enabled & bit)) {
            continue;
        }
        SaHpiEventT event;
        sensorEvent(Record, raw, bit, assertion, previous, &event);
        simPublishEvent(Record->Resource, &event);
    }
    return raw;
}

void readingOf(const SimRecordT *Record, SaHpiUint32T Raw, SaHpiSensorReadingT *Reading) noexcept
{
    const SimSensorStateT &st = Record->Sensor;
    if (st.Shape->IsThreshold) {
        numericReading(st.Shape, Raw, true, Reading);
    } else {
        memset(Reading, 0, sizeof(*Reading));
    }
    Reading->ValuesPresent |= SAHPI_SRF_EVENT_STATE;
    Reading->EventStatus.SensorStatus = st.Enables.SensorStatus;
    Reading->EventStatus.EventStatus = st.State;
}

void defaults(SimRecordT *Record) noexcept
{
    SimSensorStateT &st = Record->Sensor;
    const SimSensorShapeT *s = st.Shape;
    for (SaHpiUint32T i = 0; i < 8; i++) {
        st.Valid[i] = (s->ReadThold & ThresholdMask[i]) ? SAHPI_TRUE : SAHPI_FALSE;
        st.Raw[i] = st.Valid[i] ? s->Thresholds[i] : 0;
    }
    st.Enables.SensorStatus = SAHPI_SENSTAT_SCAN_ENABLED;
    if (s->EventCtrl != SAHPI_SEC_NO_EVENTS) {
        st.Enables.SensorStatus |= SAHPI_SENSTAT_EVENTS_ENABLED;
    }
    st.Enables.AssertEvents = s->AssertEvents;
    st.Enables.DeassertEvents = s->DeassertEvents;
}

// The frame of the threshold slots: a sensor without thresholds refuses them.
template <typename Body> SaErrorT withThresholds(void *UserData, Body body) noexcept
{
    return simWithRecord(UserData, SAHPI_SENSOR_RDR, [&](SimRecordT &R) {
        return R.Sensor.Shape->IsThreshold ? body(R) : SA_ERR_HPI_INVALID_CMD;
    });
}

// Takes the thresholds a client gives into Valid and Raw.
SaErrorT mergeThresholds(const SimSensorShapeT *S, SaHpiSensorThresholdsT *T, SaHpiBoolT *Valid,
                         SaHpiUint32T *Raw) noexcept
{
    for (SaHpiUint32T i = 0; i < 8; i++) {
        const SaHpiSensorReadingT *field = thresholdField(T, i);
        if (field->ValuesPresent == 0) {
            continue; // left as it is
        }
        SaHpiUint32T value = 0;
        SaErrorT rc = rawOf(S, field, i < 6, &value);
        if (rc != SA_OK) {
            return rc;
        }
        if (!(S->WriteThold & ThresholdMask[i])) {
            // A client that writes back what it read may repeat a fixed value.
            if (Valid[i] && Raw[i] == value) {
                continue;
            }
            return SA_ERR_HPI_INVALID_CMD;
        }
        Valid[i] = SAHPI_TRUE;
        Raw[i] = value;
    }
    return SA_OK;
}

// Limits must stay ordered: LowCritical <= LowMajor <= LowMinor <= UpMinor <=
// UpMajor <= UpCritical, counting only those the sensor has.
bool ordered(const SaHpiBoolT *Valid, const SaHpiUint32T *Raw) noexcept
{
    const SaHpiUint32T order[6] = {0, 1, 2, 5, 4, 3};
    SaHpiInt64T last = -1;
    for (SaHpiUint32T i : order) {
        if (!Valid[i]) {
            continue;
        }
        if (static_cast<SaHpiInt64T>(Raw[i]) < last) {
            return false;
        }
        last = Raw[i];
    }
    return true;
}

// The most severe of the alarm states stands for the sensor.
SaHpiEventStateT worstOf(const SimSensorShapeT *S, SaHpiEventStateT Alarms) noexcept
{
    SaHpiEventStateT worst = 0;
    SaHpiSeverityT severity = SAHPI_OK;
    for (SaHpiEventStateT bit = 1; bit != 0 && bit <= 0x4000;
         bit = static_cast<SaHpiEventStateT>(bit << 1)) {
        if ((Alarms & bit) && (worst == 0 || severityOf(S, bit) < severity)) {
            worst = bit;
            severity = severityOf(S, bit);
        }
    }
    return worst;
}

} // namespace

// ---- Model ----

void simSensorRecord(const SimRecordT *Record, SaHpiSensorRecT *Rec) noexcept
{
    const SimSensorShapeT *s = Record->Sensor.Shape;
    memset(Rec, 0, sizeof(*Rec));
    Rec->Type = s->Type;
    Rec->Category = s->Category;
    Rec->EventCtrl = s->EventCtrl;
    Rec->Events = s->Events;
    SaHpiSensorDataFormatT &f = Rec->DataFormat;
    f.ReadingFormats = SAHPI_SRF_EVENT_STATE;
    Rec->ThresholdDefn.IsThreshold = s->IsThreshold;
    if (!s->IsThreshold) {
        return;
    }
    f.ReadingFormats |= SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED;
    f.IsNumeric = SAHPI_TRUE;
    f.SignFormat = SAHPI_SDF_UNSIGNED;
    f.BaseUnits = s->Units;
    f.ModifierUnits = SAHPI_SU_UNSPECIFIED;
    f.ModifierUse = SAHPI_SMUU_NONE;
    f.FactorsStatic = SAHPI_TRUE;
    f.Factors.M_Factor = s->M;
    f.Factors.B_Factor = s->B;
    f.Factors.ExpR = s->ExpR;
    f.Factors.ExpB = s->ExpB;
    f.Factors.Linearization = SAHPI_SL_LINEAR;
    f.Range.Flags = SAHPI_SRF_MIN | SAHPI_SRF_MAX | SAHPI_SRF_NOMINAL | SAHPI_SRF_NORMAL_MIN |
                    SAHPI_SRF_NORMAL_MAX;
    numericReading(s, 0, true, &f.Range.Min);
    numericReading(s, RAW_MAX, true, &f.Range.Max);
    numericReading(s, s->NominalRaw, true, &f.Range.Nominal);
    numericReading(s, (s->ReadThold & SAHPI_STM_LOW_MINOR) ? s->Thresholds[2] : 0, true,
                   &f.Range.NormalMin);
    numericReading(s, (s->ReadThold & SAHPI_STM_UP_MINOR) ? s->Thresholds[5] : RAW_MAX, true,
                   &f.Range.NormalMax);
    SaHpiSensorThdDefnT &t = Rec->ThresholdDefn;
    t.TholdCapabilities = SAHPI_STC_RAW | SAHPI_STC_INTERPRETED;
    t.ReadThold = s->ReadThold;
    t.WriteThold = s->WriteThold;
    t.FixedThold = static_cast<SaHpiSensorThdMaskT>(s->ReadThold & ~s->WriteThold);
}

void simSensorInitialize(SimRecordT *Record) noexcept
{
    defaults(Record);
    Record->Sensor.State = 0;
}

void simSensorsEvaluate(SimResourceT *Resource) noexcept
{
    for (SaHpiUint32T i = 0; i < Resource->RecordCount; i++) {
        SimRecordT *record = &Resource->Records[i];
        if (record->Type == SAHPI_SENSOR_RDR && !record->Removed) {
            evaluate(record);
        }
    }
}

void simSensorDefaults(SimRecordT *Record) noexcept
{
    defaults(Record);
    evaluate(Record);
}

// ---- Slots ----

SaErrorT simSensorReadingGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiEventCategoryT,
                             SaHpiRdrT *, void *UserData, SaHpiSensorReadingT *Reading) noexcept
{
    if (Reading == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_SENSOR_RDR, [&](SimRecordT &R) {
        readingOf(&R, evaluate(&R), Reading);
        return SA_OK;
    });
}

SaErrorT simSensorReadingConvert(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiRdrT *,
                                 SaHpiSensorReadingT *ReadingInput, void *UserData,
                                 SaHpiSensorReadingT *ConvertedReading) noexcept
{
    SimRecordT *record = simRecordOf(UserData, SAHPI_SENSOR_RDR);
    if (record == nullptr || ReadingInput == nullptr || ConvertedReading == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    const SimSensorShapeT *s = record->Sensor.Shape;
    if (!s->IsThreshold) {
        return SA_ERR_HPI_INVALID_CMD; // nothing numeric to convert
    }
    SaHpiSensorReadingFormatsT forms =
        ReadingInput->ValuesPresent & (SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED);
    if (forms != SAHPI_SRF_RAW && forms != SAHPI_SRF_INTERPRETED) {
        return SA_ERR_HPI_INVALID_PARAMS; // exactly one form converts into the other
    }
    SaHpiUint32T raw = 0;
    SaErrorT rc = rawOf(s, ReadingInput, true, &raw);
    if (rc != SA_OK) {
        return rc;
    }
    SaHpiSensorReadingT converted;
    numericReading(s, raw, true, &converted);
    converted.ValuesPresent = forms == SAHPI_SRF_RAW ? SAHPI_SRF_INTERPRETED : SAHPI_SRF_RAW;
    if (forms == SAHPI_SRF_RAW) {
        converted.Raw = 0;
    } else {
        memset(&converted.Interpreted, 0, sizeof(converted.Interpreted));
    }
    *ConvertedReading = converted;
    return SA_OK;
}

SaErrorT simSensorThresholdsGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiRdrT *,
                                void *UserData, SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    if (SensorThresholds == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return withThresholds(UserData, [&](SimRecordT &R) {
        const SimSensorStateT &st = R.Sensor;
        memset(SensorThresholds, 0, sizeof(*SensorThresholds));
        for (SaHpiUint32T i = 0; i < 8; i++) {
            if (st.Valid[i] && (st.Shape->ReadThold & ThresholdMask[i])) {
                numericReading(st.Shape, st.Raw[i], i < 6, thresholdField(SensorThresholds, i));
            }
        }
        return SA_OK;
    });
}

SaErrorT simSensorThresholdsSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiRdrT *,
                                SaHpiSensorThresholdsT *SensorThresholds, void *UserData) noexcept
{
    if (SensorThresholds == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return withThresholds(UserData, [&](SimRecordT &R) {
        SimSensorStateT &st = R.Sensor;
        SaHpiBoolT valid[8];
        SaHpiUint32T raw[8];
        memcpy(valid, st.Valid, sizeof(valid));
        memcpy(raw, st.Raw, sizeof(raw));
        SaErrorT rc = mergeThresholds(st.Shape, SensorThresholds, valid, raw);
        if (rc != SA_OK) {
            return rc;
        }
        if (!ordered(valid, raw)) {
            return SA_ERR_HPI_INVALID_DATA;
        }
        memcpy(st.Valid, valid, sizeof(valid));
        memcpy(st.Raw, raw, sizeof(raw));
        evaluate(&R);
        return SA_OK;
    });
}

SaErrorT simSensorEventEnablesGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, void *UserData,
                                  SaHpiCapabilitiesT, SaHpiEventCategoryT,
                                  SaHpiSensorEvtEnablesT *Enables) noexcept
{
    if (Enables == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_SENSOR_RDR, [&](SimRecordT &R) {
        *Enables = R.Sensor.Enables;
        return SA_OK;
    });
}

SaErrorT simSensorEventEnablesSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT,
                                  SaHpiSensorEvtEnablesT *Enables, SaHpiRdrT *, SaHpiCapabilitiesT,
                                  void *UserData) noexcept
{
    if (Enables == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_SENSOR_RDR, [&](SimRecordT &R) {
        SimSensorStateT &st = R.Sensor;
        const SimSensorShapeT *s = st.Shape;
        if (s->EventCtrl == SAHPI_SEC_NO_EVENTS) {
            return SA_ERR_HPI_INVALID_CMD;
        }
        constexpr SaHpiSensorStatusT writable =
            SAHPI_SENSTAT_EVENTS_ENABLED | SAHPI_SENSTAT_SCAN_ENABLED;
        if (Enables->SensorStatus & ~(writable | SAHPI_SENSTAT_BUSY)) {
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        if ((Enables->AssertEvents | Enables->DeassertEvents) & ~s->Events) {
            return SA_ERR_HPI_INVALID_DATA; // states the sensor never reports
        }
        st.Enables.SensorStatus = static_cast<SaHpiSensorStatusT>(Enables->SensorStatus & writable);
        // Only a sensor controlled event by event takes the masks; the others
        // switch their events as a whole through the status.
        if (s->EventCtrl == SAHPI_SEC_PER_EVENT) {
            st.Enables.AssertEvents = Enables->AssertEvents;
            st.Enables.DeassertEvents = Enables->DeassertEvents;
        }
        return SA_OK;
    });
}

SaErrorT simActiveAlarmTranslate(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, void *UserData,
                                 SaHpiRdrT *, SaHpiRptEntryT *, SaHpiEventT *Event) noexcept
{
    if (Event == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_SENSOR_RDR, [&](SimRecordT &R) {
        SaHpiUint32T raw = evaluate(&R);
        SaHpiEventStateT alarms = alarmsOf(R.Sensor.Shape, R.Sensor.State);
        if (alarms == 0) {
            return SA_ERR_HPI_NOT_PRESENT; // not in alarm: no event
        }
        sensorEvent(&R, raw, worstOf(R.Sensor.Shape, alarms), SAHPI_TRUE, 0, Event);
        Event->EventDataUnion.SensorEvent.OptionalDataPresent &=
            static_cast<SaHpiSensorOptionalDataT>(~SAHPI_SOD_PREVIOUS_STATE);
        return SA_OK;
    });
}

// ---- Driving a reading (KviSimulator.h) ----

extern "C" __attribute__((visibility("default"))) SaErrorT
kviSimSensorReadingDrive(SaHpiResourceIdT ResourceId, SaHpiSensorNumT SensorNum, SaHpiBoolT Drive,
                         SaHpiUint32T Raw) noexcept
{
    if (Drive > SAHPI_TRUE || Raw > RAW_MAX) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimResourceT *resource = simFindResource(ResourceId);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_RESOURCE;
    }
    SimLock lock(resource);
    for (SaHpiUint32T i = 0; i < resource->RecordCount; i++) {
        SimRecordT &r = resource->Records[i];
        if (r.Type != SAHPI_SENSOR_RDR || r.Num != SensorNum || r.Removed) {
            continue;
        }
        if (!r.Sensor.Shape->IsThreshold) {
            return SA_ERR_HPI_INVALID_CMD;
        }
        r.Sensor.Driven = Drive;
        r.Sensor.DrivenRaw = Raw;
        evaluate(&r); // a crossing posts its event now, not at the next read
        return SA_OK;
    }
    return SA_ERR_HPI_NOT_PRESENT;
}
