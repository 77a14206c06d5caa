// Controls of every type. Digital, discrete, analog, stream and OEM controls
// hold one state; a text control is a small display of lines that clients
// write line by line or as a whole.
#include <cstring>

#include "SimModel.h"

namespace
{

constexpr SaHpiTextTypeT TEXT_TYPE = SAHPI_TL_TYPE_LANGUAGE;
constexpr SaHpiLanguageT TEXT_LANGUAGE = SAHPI_LANG_ENGLISH;
constexpr SaHpiUint32T DISPLAY_SIZE = SIM_TEXT_LINES * SIM_TEXT_CHARS;

bool isAllLines(SaHpiTxtLineNumT Line) noexcept
{
    return Line == 0 || Line == SAHPI_TLN_ALL_LINES;
}

// Writes text from the start of a line on, wrapping at the line width; the
// lines it reaches are replaced, text past the last line is dropped.
void writeDisplay(SimControlStateT *C, SaHpiTxtLineNumT Line, const SaHpiTextBufferT *Text) noexcept
{
    SaHpiUint32T first = 0;
    if (isAllLines(Line)) {
        memset(C->LineLength, 0, sizeof(C->LineLength));
        memset(C->Display, ' ', sizeof(C->Display));
    } else {
        first = Line - 1u;
    }
    SaHpiUint32T length = Text->DataLength;
    SaHpiUint32T line = first;
    SaHpiUint32T done = 0;
    do {
        if (line >= SIM_TEXT_LINES) {
            break;
        }
        SaHpiUint32T n = length - done < SIM_TEXT_CHARS ? length - done : SIM_TEXT_CHARS;
        memset(C->Display[line], ' ', SIM_TEXT_CHARS);
        memcpy(C->Display[line], Text->Data + done, n);
        C->LineLength[line] = static_cast<SaHpiUint8T>(n);
        done += n;
        line++;
    } while (done < length);
}

// One line, or all lines joined with each but the last padded to full width.
SaErrorT readDisplay(const SimControlStateT *C, SaHpiTxtLineNumT Line,
                     SaHpiTextBufferT *Text) noexcept
{
    memset(Text, 0, sizeof(*Text));
    Text->DataType = TEXT_TYPE;
    Text->Language = TEXT_LANGUAGE;
    if (!isAllLines(Line)) {
        if (Line > SIM_TEXT_LINES) {
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        memcpy(Text->Data, C->Display[Line - 1], C->LineLength[Line - 1]);
        Text->DataLength = C->LineLength[Line - 1];
        return SA_OK;
    }
    SaHpiUint32T length = 0;
    for (SaHpiUint32T line = 0; line < SIM_TEXT_LINES; line++) {
        if (C->LineLength[line] > 0) {
            length = line * SIM_TEXT_CHARS + C->LineLength[line];
        }
    }
    memcpy(Text->Data, C->Display, length);
    Text->DataLength = static_cast<SaHpiUint8T>(length);
    return SA_OK;
}

// The state a client reads; a text control answers for the line asked.
SaErrorT stateOf(const SimControlStateT *C, SaHpiTxtLineNumT Line, SaHpiCtrlStateT *State) noexcept
{
    if (C->Shape->Type != SAHPI_CTRL_TYPE_TEXT) {
        *State = C->State;
        return SA_OK;
    }
    SaHpiCtrlStateT text;
    memset(&text, 0, sizeof(text));
    text.Type = SAHPI_CTRL_TYPE_TEXT;
    text.StateUnion.Text.Line = isAllLines(Line) ? SAHPI_TLN_ALL_LINES : Line;
    SaErrorT rc = readDisplay(C, Line, &text.StateUnion.Text.Text);
    if (rc == SA_OK) {
        *State = text;
    }
    return rc;
}

// Takes a valid state without the rules of a client's request.
void assign(SimControlStateT *C, const SaHpiCtrlStateT *State) noexcept
{
    if (C->Shape->Type == SAHPI_CTRL_TYPE_TEXT) {
        writeDisplay(C, State->StateUnion.Text.Line, &State->StateUnion.Text.Text);
    } else {
        C->State = *State;
    }
}

SaErrorT validate(const SimControlStateT *C, const SaHpiCtrlStateT *State) noexcept
{
    const SimControlShapeT *s = C->Shape;
    if (simRaw(State->Type) != s->Type) {
        return SA_ERR_HPI_INVALID_DATA;
    }
    const SaHpiCtrlStateUnionT &u = State->StateUnion;
    switch (s->Type) {
    case SAHPI_CTRL_TYPE_DIGITAL:
        switch (simRaw(u.Digital)) {
        case SAHPI_CTRL_STATE_OFF:
        case SAHPI_CTRL_STATE_ON:
        case SAHPI_CTRL_STATE_AUTO:
            return SA_OK;
        case SAHPI_CTRL_STATE_PULSE_OFF:
            return C->State.StateUnion.Digital == SAHPI_CTRL_STATE_ON ? SA_OK
                                                                      : SA_ERR_HPI_INVALID_REQUEST;
        case SAHPI_CTRL_STATE_PULSE_ON:
            return C->State.StateUnion.Digital == SAHPI_CTRL_STATE_OFF ? SA_OK
                                                                       : SA_ERR_HPI_INVALID_REQUEST;
        default:
            return SA_ERR_HPI_INVALID_PARAMS;
        }
    case SAHPI_CTRL_TYPE_DISCRETE:
    case SAHPI_CTRL_TYPE_OEM:
        return SA_OK;
    case SAHPI_CTRL_TYPE_ANALOG:
        return u.Analog < s->Min || u.Analog > s->Max ? SA_ERR_HPI_DATA_EX_LIMITS : SA_OK;
    case SAHPI_CTRL_TYPE_STREAM:
        return u.Stream.Repeat > 1 || u.Stream.StreamLength > SAHPI_CTRL_MAX_STREAM_LENGTH
                   ? SA_ERR_HPI_INVALID_PARAMS
                   : SA_OK;
    case SAHPI_CTRL_TYPE_TEXT: {
        const SaHpiTextBufferT &t = u.Text.Text;
        if (simRaw(t.DataType) > SAHPI_TL_TYPE_LANGUAGE || simRaw(t.Language) > SAHPI_LANG_ZULU) {
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        if (t.DataType != TEXT_TYPE || t.Language != TEXT_LANGUAGE ||
            (!isAllLines(u.Text.Line) && u.Text.Line > SIM_TEXT_LINES) ||
            t.DataLength > DISPLAY_SIZE) {
            return SA_ERR_HPI_DATA_EX_LIMITS;
        }
        return SA_OK;
    }
    }
    return SA_ERR_HPI_ERROR;
}

void defaultState(const SimRecordT *Record, SaHpiCtrlStateT *State) noexcept
{
    SaHpiCtrlRecT rec;
    simControlRecord(Record, &rec);
    memset(State, 0, sizeof(*State));
    State->Type = rec.Type;
    switch (rec.Type) {
    case SAHPI_CTRL_TYPE_DIGITAL:
        State->StateUnion.Digital = rec.TypeUnion.Digital.Default;
        break;
    case SAHPI_CTRL_TYPE_DISCRETE:
        State->StateUnion.Discrete = rec.TypeUnion.Discrete.Default;
        break;
    case SAHPI_CTRL_TYPE_ANALOG:
        State->StateUnion.Analog = rec.TypeUnion.Analog.Default;
        break;
    case SAHPI_CTRL_TYPE_STREAM:
        State->StateUnion.Stream = rec.TypeUnion.Stream.Default;
        break;
    case SAHPI_CTRL_TYPE_TEXT:
        State->StateUnion.Text = rec.TypeUnion.Text.Default;
        break;
    case SAHPI_CTRL_TYPE_OEM:
        State->StateUnion.Oem = rec.TypeUnion.Oem.Default;
        break;
    }
}

} // namespace

// ---- Model ----

void simControlRecord(const SimRecordT *Record, SaHpiCtrlRecT *Rec) noexcept
{
    const SimControlShapeT *s = Record->Control.Shape;
    memset(Rec, 0, sizeof(*Rec));
    Rec->OutputType = s->OutputType;
    Rec->Type = s->Type;
    SaHpiCtrlRecUnionT &u = Rec->TypeUnion;
    switch (s->Type) {
    case SAHPI_CTRL_TYPE_DIGITAL:
        u.Digital.Default = static_cast<SaHpiCtrlStateDigitalT>(s->Default);
        break;
    case SAHPI_CTRL_TYPE_DISCRETE:
        u.Discrete.Default = static_cast<SaHpiCtrlStateDiscreteT>(s->Default);
        break;
    case SAHPI_CTRL_TYPE_ANALOG:
        u.Analog.Min = s->Min;
        u.Analog.Max = s->Max;
        u.Analog.Default = s->Default;
        break;
    case SAHPI_CTRL_TYPE_STREAM:
        u.Stream.Default.Repeat = SAHPI_FALSE;
        u.Stream.Default.StreamLength = s->Length;
        memcpy(u.Stream.Default.Stream, s->Text, s->Length);
        break;
    case SAHPI_CTRL_TYPE_TEXT:
        u.Text.MaxChars = SIM_TEXT_CHARS;
        u.Text.MaxLines = SIM_TEXT_LINES;
        u.Text.Language = TEXT_LANGUAGE;
        u.Text.DataType = TEXT_TYPE;
        u.Text.Default.Line = SAHPI_TLN_ALL_LINES;
        simText(&u.Text.Default.Text, s->Text);
        break;
    case SAHPI_CTRL_TYPE_OEM:
        u.Oem.MId = SIM_MANUFACTURER_ID;
        u.Oem.Default.MId = SIM_MANUFACTURER_ID;
        u.Oem.Default.BodyLength = s->Length;
        memcpy(u.Oem.Default.Body, s->Text, s->Length);
        break;
    }
}

void simControlInitialize(SimRecordT *Record) noexcept
{
    SimControlStateT &c = Record->Control;
    memset(c.Display, ' ', sizeof(c.Display));
    memset(c.LineLength, 0, sizeof(c.LineLength));
    c.State.Type = c.Shape->Type;
    SaHpiCtrlStateT initial;
    defaultState(Record, &initial);
    assign(&c, &initial);
}

const SimRecordT *simFindControl(const SimResourceT *Resource, SimControlRoleT Role) noexcept
{
    for (SaHpiUint32T i = 0; i < Resource->RecordCount; i++) {
        const SimRecordT *record = &Resource->Records[i];
        if (record->Type == SAHPI_CTRL_RDR && record->Control.Shape->Role == Role) {
            return record;
        }
    }
    return nullptr;
}

// ---- Slots ----

SaErrorT simControlStateGet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiCtrlNumT, void *UserData,
                            SaHpiCtrlStateT *CtrlState) noexcept
{
    if (CtrlState == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_CTRL_RDR, [&](SimRecordT &R) {
        // For a text control the caller names the line it wants to read.
        SaHpiTxtLineNumT line = simRaw(CtrlState->Type) == SAHPI_CTRL_TYPE_TEXT
                                    ? CtrlState->StateUnion.Text.Line
                                    : SAHPI_TLN_ALL_LINES;
        return stateOf(&R.Control, line, CtrlState);
    });
}

SaErrorT simControlStateSet(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiCtrlNumT,
                            SaHpiCtrlStateT *CtrlState, void *UserData) noexcept
{
    if (CtrlState == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return simWithRecord(UserData, SAHPI_CTRL_RDR, [&](SimRecordT &R) {
        SimControlStateT &c = R.Control;
        SaErrorT rc = validate(&c, CtrlState);
        if (rc != SA_OK) {
            return rc;
        }
        if (c.Shape->Type == SAHPI_CTRL_TYPE_DIGITAL &&
            (CtrlState->StateUnion.Digital == SAHPI_CTRL_STATE_PULSE_ON ||
             CtrlState->StateUnion.Digital == SAHPI_CTRL_STATE_PULSE_OFF)) {
            c.Pulses++; // a pulse returns to the state it started from
        } else {
            assign(&c, CtrlState);
        }
        // Controls with a role act on the resource's readings.
        if (c.Shape->Role != SIM_CTRL_PLAIN) {
            simSensorsEvaluate(R.Resource);
        }
        return SA_OK;
    });
}
