#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

class ControlHelpersTest : public ParmControlTest
{
  protected:
    SaErrorT defaults(Record &C, SaHpiResourceIdT Rid = 1)
    {
        return kviCsRestoreControlDefaults(DOM, Rid, &C.Rdr, &C.Table, C.State);
    }
    SaErrorT save(Record &C, SaHpiResourceIdT Rid)
    {
        return kviCsRdrSaveCtrlParmControl(DOM, Rid, &C.Rdr, &C.Table, C.State);
    }
    SaErrorT restore(Record &C, SaHpiResourceIdT Rid, SaHpiBoolT Daemon)
    {
        return kviCsRdrRestoreCtrl(DOM, Rid, Daemon, &C.Rdr, &C.Table, C.State);
    }
};

// Each control type is set to the default its record declares; a type HPI
// does not know is refused.
TEST_F(ControlHelpersTest, DefaultsComeFromTheRecordOfEachType)
{
    Record digital = control(SAHPI_CTRL_TYPE_DIGITAL), discrete = control(SAHPI_CTRL_TYPE_DISCRETE),
           analog = control(SAHPI_CTRL_TYPE_ANALOG), stream = control(SAHPI_CTRL_TYPE_STREAM),
           textual = control(SAHPI_CTRL_TYPE_TEXT), oem = control(SAHPI_CTRL_TYPE_OEM),
           odd = control(static_cast<SaHpiCtrlTypeT>(5));
    auto rec = [](Record &C) -> SaHpiCtrlRecUnionT & {
        return C.Rdr.RdrTypeUnion.CtrlRec.TypeUnion;
    };
    rec(digital).Digital.Default = SAHPI_CTRL_STATE_PULSE_ON;
    rec(discrete).Discrete.Default = 0xDEADBEEF;
    rec(analog).Analog.Default = -77;
    rec(stream).Stream.Default = {SAHPI_TRUE, 3, {9, 8, 7, 0}};
    rec(textual).Text.Default.Line = 4;
    rec(textual).Text.Default.Text = text("default text");
    rec(oem).Oem.Default.MId = 0x1234;
    rec(oem).Oem.Default.Body[1] = 0x55;
    for (Record *c : {&digital, &discrete, &analog, &stream, &textual, &oem})
        ASSERT_EQ(defaults(*c), SA_OK);
    EXPECT_EQ(digital.State->Ctrl.Type, SAHPI_CTRL_TYPE_DIGITAL);
    EXPECT_EQ(digital.State->Ctrl.StateUnion.Digital, SAHPI_CTRL_STATE_PULSE_ON);
    EXPECT_EQ(discrete.State->Ctrl.StateUnion.Discrete, 0xDEADBEEFu);
    EXPECT_EQ(analog.State->Ctrl.StateUnion.Analog, -77);
    EXPECT_TRUE(stream.State->Ctrl.StateUnion.Stream.Repeat);
    EXPECT_EQ(stream.State->Ctrl.StateUnion.Stream.Stream[2], 7);
    EXPECT_EQ(textual.State->Ctrl.StateUnion.Text.Line, 4);
    EXPECT_EQ(str(textual.State->Ctrl.StateUnion.Text.Text), "default text");
    EXPECT_EQ(oem.State->Ctrl.Type, SAHPI_CTRL_TYPE_OEM);
    EXPECT_EQ(oem.State->Ctrl.StateUnion.Oem.MId, 0x1234u);
    EXPECT_EQ(oem.State->Ctrl.StateUnion.Oem.Body[1], 0x55);
    KviLogCapture log;
    EXPECT_EQ(defaults(odd), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "Invalid Control Type"));
    EXPECT_EQ(calls.size(), 6u);
}

// A text control is read with all of its lines and saved under flag 0; an
// explicit restore reads it back from there, a daemon restore from flag 1,
// and only an explicit one refuses a missing copy.
TEST_F(ControlHelpersTest, SaveAsksForAllLinesAndRestoreReadsTheCopyItsCallerNames)
{
    Record c = control(SAHPI_CTRL_TYPE_TEXT), d = control();
    c.State->Ctrl = {SAHPI_CTRL_TYPE_TEXT, {}};
    c.State->Ctrl.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
    c.State->Ctrl.StateUnion.Text.Text = text("0123456789ABC");
    SaHpiResourceIdT rid = addResource({&c, &d});
    ASSERT_EQ(save(c, rid), SA_OK);
    EXPECT_EQ(c.State->LineAsked, SAHPI_TLN_ALL_LINES);
    EXPECT_EQ(storedLength(nvKey(KVI_NVKEY_CONTROL_STATE_PREFIX, 0, rid, 1)), 13u + 10u);
    c.State->Ctrl.StateUnion.Text.Text = text("other");
    ASSERT_EQ(restore(c, rid, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(c.State->Ctrl.StateUnion.Text.Text.DataLength, 13);
    EXPECT_EQ(std::string(reinterpret_cast<char *>(c.State->Ctrl.StateUnion.Text.Text.Data), 6),
              "012345");

    calls.clear();
    KviLogCapture log;
    EXPECT_EQ(restore(d, rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(restore(d, rid, SAHPI_FALSE), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Parm control restore was called without a save done first"));
    EXPECT_TRUE(calls.empty());
    SaHpiCtrlStateT daemonCopy = discrete(1), explicitCopy = discrete(2);
    ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, rid, 2, SAHPI_TRUE, &daemonCopy), SA_OK);
    ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, rid, 2, SAHPI_FALSE, &explicitCopy), SA_OK);
    ASSERT_EQ(restore(d, rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(d.State->Ctrl.StateUnion.Discrete, 1u);
    ASSERT_EQ(restore(d, rid, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(d.State->Ctrl.StateUnion.Discrete, 2u);
}

// An empty set slot is an error for the restore but an invalid command for
// the defaults; both answers are kept. Failing gets, sets and stores are
// errors.
TEST_F(ControlHelpersTest, EmptySlotsAndFailuresAreAnsweredAsCallersExpect)
{
    Record c = control();
    SaHpiResourceIdT rid = addResource({&c});
    SaHpiCtrlStateT state = discrete(0);
    ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, rid, 1, SAHPI_FALSE, &state), SA_OK);
    KviLogCapture log;
    c.Table.ControlStateSet = nullptr;
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_EQ(defaults(c, rid), SA_ERR_HPI_INVALID_CMD);
    EXPECT_TRUE(log.contains("ControlStateSet is NULL."));
    c.Table.ControlStateGet = nullptr;
    EXPECT_EQ(save(c, rid), SA_ERR_HPI_INVALID_CMD);
    EXPECT_TRUE(log.contains("ControlStateGet is NULL."));

    c.Table = ctrlTable();
    c.State->SetResult = SA_ERR_HPI_INVALID_DATA;
    c.State->GetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_EQ(defaults(c, rid), SA_ERR_HPI_ERROR);
    EXPECT_EQ(log.matching("Failed to set default control state. Ctrl Num 1").size(), 2u);
    EXPECT_EQ(save(c, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "ControlStateGet failed. rc -1003"));

    c.State->GetResult = SA_OK;
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(save(c, rid), SA_ERR_HPI_ERROR);
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "kviCsSaveCtrlStateNV failed. rc=-1001"));
    ASSERT_EQ(
        kviCsNonVolatilePut(nvKey(KVI_NVKEY_CONTROL_STATE_PREFIX, 0, rid, 1).c_str(), 2, "xy"),
        SA_OK);
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to get control state from NV"));
}

TEST_F(ControlHelpersTest, ARefusedNullArgumentIsNamed)
{
    Record c = control();
    KviLogCapture log;
    EXPECT_EQ(kviCsRestoreControlDefaults(DOM, 1, nullptr, &c.Table, c.State),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRdrSaveCtrlParmControl(DOM, 1, &c.Rdr, nullptr, c.State),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRdrRestoreCtrl(DOM, 1, SAHPI_FALSE, &c.Rdr, &c.Table, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    for (const char *line :
         {"Rdr pointer is NULL.", "FnTable pointer is NULL.", "UserData pointer is NULL."})
        EXPECT_TRUE(log.contains(line)) << line;
    EXPECT_TRUE(calls.empty());
}

} // namespace
