#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

class ControlHelpersTest : public ParmControlTest
{
  protected:
    Record control(SaHpiCtrlTypeT Type = SAHPI_CTRL_TYPE_DISCRETE)
    {
        return {ctrlRdr(Type), ctrlTable(), fake()};
    }
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

// Each control type is set to the default its record declares.
TEST_F(ControlHelpersTest, DefaultsComeFromTheRecordOfEachType)
{
    Record digital = control(SAHPI_CTRL_TYPE_DIGITAL), discrete = control(SAHPI_CTRL_TYPE_DISCRETE),
           analog = control(SAHPI_CTRL_TYPE_ANALOG), stream = control(SAHPI_CTRL_TYPE_STREAM),
           textual = control(SAHPI_CTRL_TYPE_TEXT), oem = control(SAHPI_CTRL_TYPE_OEM);
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
    rec(oem).Oem.Default.BodyLength = 2;
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
}

TEST_F(ControlHelpersTest, DefaultsRefuseUnknownTypesEmptySlotsAndFailingSets)
{
    KviLogCapture log;
    Record odd = control(static_cast<SaHpiCtrlTypeT>(5));
    EXPECT_EQ(defaults(odd), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "Invalid Control Type"));

    Record noSlot = control();
    noSlot.Table.ControlStateSet = nullptr;
    EXPECT_EQ(defaults(noSlot), SA_ERR_HPI_INVALID_CMD);
    EXPECT_TRUE(log.contains("ControlStateSet is NULL."));

    Record failing = control();
    failing.Rdr.RdrTypeUnion.CtrlRec.Num = 6;
    failing.State->SetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(defaults(failing), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to set default control state. Ctrl Num 6"));
    EXPECT_EQ(calls.size(), 1u);
}

TEST_F(ControlHelpersTest, ARefusedNullArgumentIsNamed)
{
    Record c = control();
    KviLogCapture log;
    for (SaErrorT rc : {
             kviCsRestoreControlDefaults(DOM, 1, nullptr, &c.Table, c.State),
             kviCsRestoreControlDefaults(DOM, 1, &c.Rdr, nullptr, c.State),
             kviCsRestoreControlDefaults(DOM, 1, &c.Rdr, &c.Table, nullptr),
             kviCsRdrSaveCtrlParmControl(DOM, 1, nullptr, &c.Table, c.State),
             kviCsRdrSaveCtrlParmControl(DOM, 1, &c.Rdr, nullptr, c.State),
             kviCsRdrSaveCtrlParmControl(DOM, 1, &c.Rdr, &c.Table, nullptr),
             kviCsRdrRestoreCtrl(DOM, 1, SAHPI_FALSE, nullptr, &c.Table, c.State),
             kviCsRdrRestoreCtrl(DOM, 1, SAHPI_FALSE, &c.Rdr, nullptr, c.State),
             kviCsRdrRestoreCtrl(DOM, 1, SAHPI_FALSE, &c.Rdr, &c.Table, nullptr),
         })
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
    for (const char *line :
         {"Rdr pointer is NULL.", "FnTable pointer is NULL.", "UserData pointer is NULL."})
        EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, line)) << line;
    EXPECT_TRUE(calls.empty());
}

// A text control is read with all of its lines and saved under flag 0; an
// explicit restore reads it back from there.
TEST_F(ControlHelpersTest, SaveAsksForAllLinesAndRestoreBringsTheStateBack)
{
    Record c = control(SAHPI_CTRL_TYPE_TEXT);
    c.State->Ctrl.Type = SAHPI_CTRL_TYPE_TEXT;
    c.State->Ctrl.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
    c.State->Ctrl.StateUnion.Text.Text = text("0123456789ABC");
    SaHpiResourceIdT rid = addResource({&c});
    ASSERT_EQ(save(c, rid), SA_OK);
    EXPECT_EQ(c.State->LineAsked, SAHPI_TLN_ALL_LINES);
    EXPECT_EQ(storedLength(rdrKey(KVI_NVKEY_CONTROL_STATE_PREFIX, 0, rid, 1)), 13u + 10u);

    c.State->Ctrl.StateUnion.Text.Text = text("other");
    ASSERT_EQ(restore(c, rid, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(c.State->Ctrl.StateUnion.Text.Text.DataLength, 13);
    EXPECT_EQ(std::string(reinterpret_cast<char *>(c.State->Ctrl.StateUnion.Text.Text.Data), 6),
              "012345");
}

// A daemon restore reads the flag-1 copy and passes over a missing one; an
// explicit restore reads the flag-0 copy and refuses a missing one.
TEST_F(ControlHelpersTest, RestoreReadsTheCopyItsCallerNames)
{
    Record c = control();
    SaHpiResourceIdT rid = addResource({&c});
    KviLogCapture log;
    EXPECT_EQ(restore(c, rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Parm control restore was called without a save done first"));
    EXPECT_TRUE(calls.empty());

    SaHpiCtrlStateT daemonCopy{SAHPI_CTRL_TYPE_DISCRETE, {}}, explicitCopy = daemonCopy;
    daemonCopy.StateUnion.Discrete = 1;
    explicitCopy.StateUnion.Discrete = 2;
    ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, rid, 1, SAHPI_TRUE, &daemonCopy), SA_OK);
    ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, rid, 1, SAHPI_FALSE, &explicitCopy), SA_OK);
    ASSERT_EQ(restore(c, rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(c.State->Ctrl.StateUnion.Discrete, 1u);
    ASSERT_EQ(restore(c, rid, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(c.State->Ctrl.StateUnion.Discrete, 2u);
}

// An empty set slot is an error for the restore but an invalid command for
// the defaults; both answers are kept.
TEST_F(ControlHelpersTest, RestoreAndDefaultsAnswerAnEmptySetSlotDifferently)
{
    Record c = control();
    SaHpiResourceIdT rid = addResource({&c});
    SaHpiCtrlStateT state{SAHPI_CTRL_TYPE_DISCRETE, {}};
    ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, rid, 1, SAHPI_FALSE, &state), SA_OK);
    c.Table.ControlStateSet = nullptr;
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_EQ(defaults(c, rid), SA_ERR_HPI_INVALID_CMD);

    KviLogCapture log;
    c.Table = ctrlTable();
    c.State->SetResult = SA_ERR_HPI_INVALID_DATA;
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to set default control state. Ctrl Num 1"));

    ASSERT_EQ(
        kviCsNonVolatilePut(rdrKey(KVI_NVKEY_CONTROL_STATE_PREFIX, 0, rid, 1).c_str(), 2, "xy"),
        SA_OK);
    EXPECT_EQ(restore(c, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to get control state from NV"));
}

TEST_F(ControlHelpersTest, SaveFailuresAreReported)
{
    Record c = control();
    SaHpiResourceIdT rid = addResource({&c});
    KviLogCapture log;
    c.Table.ControlStateGet = nullptr;
    EXPECT_EQ(save(c, rid), SA_ERR_HPI_INVALID_CMD);
    EXPECT_TRUE(log.contains("ControlStateGet is NULL."));

    c.Table = ctrlTable();
    c.State->GetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(save(c, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM,
                         "ControlStateGet failed. rc " + std::to_string(SA_ERR_HPI_BUSY)));

    c.State->GetResult = SA_OK;
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(save(c, rid), SA_ERR_HPI_ERROR);
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM,
                         "kviCsSaveCtrlStateNV failed. rc=" + std::to_string(SA_ERR_HPI_ERROR)));
}

} // namespace
