#include <algorithm>
#include <cerrno>

#include "core/utils/NonVolatileStorage.h"
#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

class ParmControlUnitTest : public ParmControlTest
{
  protected:
    void TearDown() override
    {
        kviCsNvFileOps = kviCsNvDefaultFileOps;
        ParmControlTest::TearDown();
    }

    Record thresholdSensor(SaHpiSensorThdMaskT Writable = 0x3F)
    {
        return {sensorRdr(SAHPI_TRUE, SAHPI_SEC_PER_EVENT, Writable), sensorTable(), fake()};
    }
    Record control(SaHpiCtrlTypeT Type = SAHPI_CTRL_TYPE_DISCRETE)
    {
        return {ctrlRdr(Type), ctrlTable(), fake()};
    }

    SaErrorT parm(SaHpiResourceIdT Rid, int Action)
    {
        KviDsRptFnTable table{};
        void *user = nullptr;
        EXPECT_EQ(kviCsRptActiveEntryGetByRid(DOM, Rid, nullptr, &table, &user, nullptr, nullptr),
                  SA_OK);
        return kviCsParmControl(DOM, Rid, static_cast<SaHpiParmActionT>(Action), &table, user);
    }

    bool calledSlot(const std::string &Prefix)
    {
        return std::any_of(calls.begin(), calls.end(),
                           [&](const std::string &c) { return c.rfind(Prefix, 0) == 0; });
    }
};

// The Nth write of an object file from now fails as on a full disk.
int writesUntilFailure = 0;
ssize_t failingWrite(int Fd, const void *Buffer, size_t Count)
{
    if (--writesUntilFailure == 0) {
        errno = ENOSPC;
        return -1;
    }
    return kviCsNvDefaultFileOps.writeFile(Fd, Buffer, Count);
}

TEST_F(ParmControlUnitTest, RefusesNullTableOrUserDataAndUnknownActionsBeforeAnySlot)
{
    SaHpiResourceIdT rid = addResource({});
    KviDsRptFnTable table = rptTable();
    int user = 0;
    KviLogCapture log;
    EXPECT_EQ(kviCsParmControl(DOM, rid, SAHPI_SAVE_PARM, nullptr, &user),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("FnTable pointer is NULL."));
    EXPECT_EQ(kviCsParmControl(DOM, rid, SAHPI_SAVE_PARM, &table, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("UserDefined pointer is NULL."));
    EXPECT_EQ(parm(rid, 3), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Invalid Parm Action 3"));
    EXPECT_TRUE(calls.empty());
}

// Save, change everything, restore: each setting is back, the resource's
// before its records'.
TEST_F(ParmControlUnitTest, RestoreBringsBackWhatSaveKept)
{
    Record sensor = thresholdSensor(), ctrl = control();
    sensor.State->Thresholds = thresholds(10);
    sensor.State->Enables = {SAHPI_SENSTAT_EVENTS_ENABLED, 0x11, 0x22};
    ctrl.State->Ctrl.Type = SAHPI_CTRL_TYPE_DISCRETE;
    ctrl.State->Ctrl.StateUnion.Discrete = 5;
    SaHpiResourceIdT rid = addResource({&sensor, &ctrl}, "saved tag", SAHPI_MAJOR);
    resource(rid)->EventLog = SAHPI_FALSE;

    ASSERT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_OK);
    EXPECT_EQ(calls.front(), "EvtLogGet " + std::to_string(rid) + "/0");

    SaHpiTextBufferT other = text("changed");
    ASSERT_EQ(kviCsRptEntryModifyTagByRid(DOM, rid, &other), SA_OK);
    ASSERT_EQ(kviCsRptEntryModifySeverityByRid(DOM, rid, SAHPI_CRITICAL), SA_OK);
    resource(rid)->EventLog = SAHPI_TRUE;
    sensor.State->Thresholds = thresholds(50);
    sensor.State->Enables = {};
    ctrl.State->Ctrl.StateUnion.Discrete = 9;

    calls.clear();
    ASSERT_EQ(parm(rid, SAHPI_RESTORE_PARM), SA_OK);
    EXPECT_EQ(str(entry(rid).ResourceTag), "saved tag");
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MAJOR);
    EXPECT_EQ(resource(rid)->EventLog, SAHPI_FALSE);
    SaHpiSensorThresholdsT expected = thresholds(10);
    EXPECT_TRUE(same(&sensor.State->Thresholds, &expected, sizeof expected));
    EXPECT_EQ(sensor.State->Enables.AssertEvents, 0x11);
    EXPECT_EQ(ctrl.State->Ctrl.StateUnion.Discrete, 5u);
    EXPECT_EQ(calls.front(), "EvtLogSet " + std::to_string(rid) + "/0");
    EXPECT_EQ(sensor.State->CapabilitiesSeen, entry(rid).ResourceCapabilities);
}

TEST_F(ParmControlUnitTest, DefaultsGoThroughTheResourceSlotThenTheControls)
{
    Record sensor = thresholdSensor(), ctrl = control(SAHPI_CTRL_TYPE_ANALOG);
    ctrl.Rdr.RdrTypeUnion.CtrlRec.TypeUnion.Analog.Default = -3;
    SaHpiResourceIdT rid = addResource({&sensor, &ctrl});
    KviLogCapture log;
    ASSERT_EQ(parm(rid, SAHPI_DEFAULT_PARM), SA_OK);
    EXPECT_EQ(calls.front(), "RptDefault " + std::to_string(rid) + "/0");
    EXPECT_EQ(ctrl.State->Ctrl.StateUnion.Analog, -3);
    EXPECT_TRUE(log.contains("Restore default parm control"));
    EXPECT_TRUE(log.contains("RdrDefaultParmControl is NULL. Skipping RDR."));
}

TEST_F(ParmControlUnitTest, EmptySlotsAreSkipped)
{
    Record sensor = thresholdSensor();
    sensor.Table.RdrSaveParmControl = nullptr;
    sensor.Table.RdrRestoreParmControl = nullptr;
    KviDsRptFnTable bare{};
    SaHpiResourceIdT rid = addResource({&sensor}, "t", SAHPI_OK, bare);
    KviLogCapture log;
    EXPECT_EQ(parm(rid, SAHPI_DEFAULT_PARM), SA_OK);
    EXPECT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_OK);
    EXPECT_EQ(parm(rid, SAHPI_RESTORE_PARM), SA_OK);
    EXPECT_TRUE(log.contains(
        "RptDefaultParmControl is NULL. Skipping RPT entry default parm control restore."));
    EXPECT_TRUE(log.contains(">RptSaveParmControl is NULL. Skipping RPT entry save parm control"));
    EXPECT_TRUE(
        log.contains(">RptRestoreParmControl is NULL. Skipping RPT entry restore parm control"));
    EXPECT_TRUE(log.contains("RdrSaveParmControl is NULL. Skipping RDR."));
    EXPECT_TRUE(log.contains("RdrRestoreParmControl is NULL. Skipping RDR."));
    EXPECT_TRUE(calls.empty());
}

TEST_F(ParmControlUnitTest, AResourceWithoutRecordsSavesItsOwnSettings)
{
    SaHpiResourceIdT rid = addResource({}, "lonely");
    KviLogCapture log;
    ASSERT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_OK);
    EXPECT_TRUE(log.contains("No RDRs exist. Returning OK"));
    SaHpiTextBufferT tag{};
    EXPECT_EQ(kviCsGetResTagNV(DOM, rid, SAHPI_FALSE, &tag), SA_OK);
    EXPECT_EQ(str(tag), "lonely");
    SaHpiBoolT state = SAHPI_FALSE;
    EXPECT_EQ(kviCsGetEvtLogStNV(DOM, rid, SAHPI_FALSE, &state), SA_OK);
    EXPECT_EQ(state, SAHPI_TRUE);
}

TEST_F(ParmControlUnitTest, AFailingResourceSlotLeavesTheRecordsAlone)
{
    Record sensor = thresholdSensor();
    SaHpiResourceIdT rid = addResource({&sensor});
    resource(rid)->GetResult = SA_ERR_HPI_BUSY;
    KviLogCapture log;
    EXPECT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(log.contains("EventLogStateGet failed. rc=" + std::to_string(SA_ERR_HPI_BUSY)));
    EXPECT_TRUE(log.contains("RptSaveParmControl failed. rc=" + std::to_string(SA_ERR_HPI_BUSY) +
                             ", rid=" + std::to_string(rid)));
    EXPECT_FALSE(calledSlot("ThresholdsGet"));
}

// Records are walked in the table's order (3, 1, 2 for three records); the
// first failure ends the walk and what was done before it stays done.
TEST_F(ParmControlUnitTest, TheFirstFailingRecordEndsTheWalk)
{
    Record one = thresholdSensor(), two = thresholdSensor(), three = thresholdSensor();
    one.State->GetResult = SA_ERR_HPI_INVALID_DATA;
    SaHpiResourceIdT rid = addResource({&one, &two, &three});
    KviLogCapture log;
    EXPECT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_ERR_HPI_ERROR);
    SaHpiSensorThresholdsT th{};
    EXPECT_EQ(kviCsGetThreshNV(DOM, rid, 3, SAHPI_FALSE, &th), SA_OK);
    EXPECT_EQ(kviCsGetThreshNV(DOM, rid, 2, SAHPI_TRUE, &th), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_FALSE(calledSlot("ThresholdsGet " + std::to_string(rid) + "/2"));
    EXPECT_TRUE(log.contains("kviIsSensorThresholdsGet failed. rc " +
                             std::to_string(SA_ERR_HPI_INVALID_DATA)));
    EXPECT_TRUE(log.contains("RdrSaveParmControl failed. rc " + std::to_string(SA_ERR_HPI_ERROR)));
    EXPECT_TRUE(log.contains("kviCsRdrPerformParmAction failed. rc=" +
                             std::to_string(SA_ERR_HPI_ERROR) + ", rid=" + std::to_string(rid)));
}

TEST_F(ParmControlUnitTest, RecordsOtherThanSensorsControlsAndInventoriesAreIgnored)
{
    Record watchdog{{}, sensorTable(), fake()};
    watchdog.Rdr.RdrType = SAHPI_WATCHDOG_RDR;
    SaHpiResourceIdT rid = addResource({&watchdog});
    KviLogCapture log;
    EXPECT_EQ(kviCsRdrPerformParmAction(DOM, rid, SAHPI_SAVE_PARM), SA_OK);
    EXPECT_TRUE(log.contains("Ignoring Rdr. Type 4"));
    EXPECT_TRUE(calls.empty());

    // An action out of range is met at the first record that takes part.
    Record sensor = thresholdSensor();
    SaHpiResourceIdT other = addResource({&sensor});
    EXPECT_EQ(kviCsRdrPerformParmAction(DOM, other, static_cast<SaHpiParmActionT>(3)),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Invalid Parm Control Action"));
}

TEST_F(ParmControlUnitTest, ExplicitRestoreWithoutASaveIsAnInvalidRequest)
{
    Record sensor = thresholdSensor();
    SaHpiResourceIdT rid = addResource({&sensor});
    KviLogCapture log;
    EXPECT_EQ(parm(rid, SAHPI_RESTORE_PARM), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Parm control restore was called without a save done first"));
    EXPECT_TRUE(log.contains("RptRestoreParmControl failed. rc=" +
                             std::to_string(SA_ERR_HPI_INVALID_REQUEST)));
    EXPECT_FALSE(calledSlot("ThresholdsSet"));

    // A daemon restore passes over what was never saved.
    KviDsRptFnTable table = rptTable();
    EXPECT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_TRUE), SA_OK);
    EXPECT_TRUE(calls.empty());
}

// The tag and the event-log state follow DaemonRestore; the severity is read
// from the explicit save's copy whoever restores.
TEST_F(ParmControlUnitTest, TheSeverityIsAlwaysReadFromTheExplicitCopy)
{
    SaHpiResourceIdT rid = addResource({}, "discovered", SAHPI_MINOR);
    SaHpiTextBufferT tag = text("daemon's tag");
    SaHpiSeverityT daemonSeverity = SAHPI_CRITICAL, explicitSeverity = SAHPI_MAJOR;
    ASSERT_EQ(kviCsSaveResTagNV(DOM, rid, SAHPI_TRUE, &tag), SA_OK);
    ASSERT_EQ(kviCsSaveResSeverityNV(DOM, rid, SAHPI_TRUE, &daemonSeverity), SA_OK);
    ASSERT_EQ(kviCsSaveEvtLogStNV(DOM, rid, SAHPI_TRUE, SAHPI_FALSE), SA_OK);
    KviDsRptFnTable table = rptTable();

    ASSERT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_TRUE), SA_OK);
    EXPECT_EQ(str(entry(rid).ResourceTag), "daemon's tag");
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MINOR);
    EXPECT_EQ(resource(rid)->EventLog, SAHPI_FALSE);

    ASSERT_EQ(kviCsSaveResSeverityNV(DOM, rid, SAHPI_FALSE, &explicitSeverity), SA_OK);
    ASSERT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_TRUE), SA_OK);
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MAJOR);
}

TEST_F(ParmControlUnitTest, ExplicitRestoreNeedsEverySavedResourceItem)
{
    SaHpiResourceIdT rid = addResource({});
    KviDsRptFnTable table = rptTable();
    SaHpiTextBufferT tag = text("t");
    SaHpiSeverityT severity = SAHPI_OK;
    ASSERT_EQ(kviCsSaveResTagNV(DOM, rid, SAHPI_FALSE, &tag), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_FALSE),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not find severity"));

    ASSERT_EQ(kviCsSaveResSeverityNV(DOM, rid, SAHPI_FALSE, &severity), SA_OK);
    EXPECT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_FALSE),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not restore event log state"));

    ASSERT_EQ(kviCsSaveEvtLogStNV(DOM, rid, SAHPI_FALSE, SAHPI_FALSE), SA_OK);
    resource(rid)->SetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_FALSE),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("Could not restore event log state. " + std::to_string(SA_ERR_HPI_BUSY)));

    table.EventLogStateSet = nullptr;
    EXPECT_EQ(kviCsRptRestoreParmControl(DOM, rid, &table, resource(rid), SAHPI_FALSE), SA_OK);
    EXPECT_TRUE(log.contains("EventLogStateSet is NULL."));
}

// Only the event-log state may fail to be stored without failing the save.
TEST_F(ParmControlUnitTest, AnUnstorableEventLogStateDoesNotFailTheSave)
{
    SaHpiResourceIdT rid = addResource({});
    KviDsRptFnTable table = rptTable();
    kviCsNvFileOps.writeFile = failingWrite;
    KviLogCapture log;
    writesUntilFailure = 1;
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, rid, &table, resource(rid)), SA_OK);
    EXPECT_TRUE(log.contains("kviCsSaveEvtLogStNV failed. rc=" + std::to_string(SA_ERR_HPI_ERROR)));
    writesUntilFailure = 2;
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, rid, &table, resource(rid)), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsSaveResTagNV failed. rc=" + std::to_string(SA_ERR_HPI_ERROR)));
    writesUntilFailure = 3;
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, rid, &table, resource(rid)), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("kviCsSaveResSeverityNV failed. rc=" + std::to_string(SA_ERR_HPI_ERROR)));

    table.EventLogStateGet = nullptr;
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, rid, &table, resource(rid)), SA_OK);
    EXPECT_TRUE(log.contains("Event log state not saved"));
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, 0xDEAD, &table, resource(rid)), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("kviCsRptActiveEntryGetByRid failed. rc=" +
                             std::to_string(SA_ERR_HPI_NOT_PRESENT)));
}

TEST_F(ParmControlUnitTest, SensorsWithoutThresholdsOrEventsHaveNothingToSave)
{
    Record plain{sensorRdr(SAHPI_FALSE, SAHPI_SEC_NO_EVENTS), sensorTable(), fake()};
    SaHpiResourceIdT rid = addResource({&plain});
    KviLogCapture log;
    EXPECT_EQ(kviCsRdrSaveSensorParmControl(DOM, rid, &plain.Rdr, &plain.Table, plain.State),
              SA_OK);
    EXPECT_EQ(kviCsRdrRestoreSensor(DOM, rid, SAHPI_FALSE, &plain.Rdr, &plain.Table, plain.State),
              SA_OK);
    EXPECT_TRUE(calls.empty());
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Sensor does not support thresholds. None Saved"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Sensor does not support events. None Saved"));
}

// Thresholds the record does not declare writable go to the plug-in as
// zeroes; the hysteresis values as saved.
TEST_F(ParmControlUnitTest, OnlyWritableThresholdsAreRestored)
{
    Record sensor = thresholdSensor(SAHPI_STM_LOW_MINOR | SAHPI_STM_UP_CRIT);
    sensor.State->Thresholds = thresholds(20);
    SaHpiResourceIdT rid = addResource({&sensor});
    ASSERT_EQ(kviCsRdrSaveSensorParmControl(DOM, rid, &sensor.Rdr, &sensor.Table, sensor.State),
              SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_FALSE, &sensor.State->Enables), SA_OK);
    sensor.State->Thresholds = {};
    ASSERT_EQ(
        kviCsRdrRestoreSensor(DOM, rid, SAHPI_FALSE, &sensor.Rdr, &sensor.Table, sensor.State),
        SA_OK);
    const SaHpiSensorThresholdsT &t = sensor.State->Thresholds;
    SaHpiSensorReadingT zero{};
    EXPECT_EQ(t.LowMinor.Raw, 23u);
    EXPECT_EQ(t.UpCritical.Raw, 24u);
    for (const SaHpiSensorReadingT *r : {&t.LowMajor, &t.LowCritical, &t.UpMinor, &t.UpMajor})
        EXPECT_TRUE(same(r, &zero, sizeof zero));
    EXPECT_EQ(t.PosThdHysteresis.Raw, 27u);
    EXPECT_EQ(t.NegThdHysteresis.Raw, 28u);
}

// Thresholds follow IsDaemonRestore; event enables are read from the
// explicit copy even in a daemon restore.
TEST_F(ParmControlUnitTest, SensorRestoreReadsThresholdsByFlagAndEnablesFromTheExplicitCopy)
{
    Record sensor = thresholdSensor();
    SaHpiResourceIdT rid = addResource({&sensor});
    SaHpiSensorThresholdsT daemonCopy = thresholds(100), explicitCopy = thresholds(200);
    SaHpiSensorEvtEnablesT daemonEnables{SAHPI_SENSTAT_EVENTS_ENABLED, 0x7, 0x7};
    ASSERT_EQ(kviCsSaveThreshNV(DOM, rid, 1, SAHPI_TRUE, &daemonCopy), SA_OK);
    ASSERT_EQ(kviCsSaveThreshNV(DOM, rid, 1, SAHPI_FALSE, &explicitCopy), SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_TRUE, &daemonEnables), SA_OK);
    KviLogCapture log;

    EXPECT_EQ(kviCsRdrRestoreSensor(DOM, rid, SAHPI_TRUE, &sensor.Rdr, &sensor.Table, sensor.State),
              SA_OK);
    EXPECT_EQ(sensor.State->Thresholds.UpMajor.Raw, 105u);
    EXPECT_FALSE(calledSlot("EnablesSet"));

    EXPECT_EQ(
        kviCsRdrRestoreSensor(DOM, rid, SAHPI_FALSE, &sensor.Rdr, &sensor.Table, sensor.State),
        SA_ERR_HPI_ERROR);
    EXPECT_EQ(sensor.State->Thresholds.UpMajor.Raw, 205u);
    EXPECT_TRUE(log.contains("Could not find events"));

    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_FALSE, &daemonEnables), SA_OK);
    EXPECT_EQ(kviCsRdrRestoreSensor(DOM, rid, SAHPI_TRUE, &sensor.Rdr, &sensor.Table, sensor.State),
              SA_OK);
    EXPECT_EQ(sensor.State->Enables.DeassertEvents, 0x7);
}

TEST_F(ParmControlUnitTest, SensorSlotFailuresAreErrors)
{
    Record sensor = thresholdSensor();
    SaHpiResourceIdT rid = addResource({&sensor});
    SaHpiSensorThresholdsT th = thresholds(1);
    SaHpiSensorEvtEnablesT enables{};
    ASSERT_EQ(kviCsSaveThreshNV(DOM, rid, 1, SAHPI_FALSE, &th), SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_FALSE, &enables), SA_OK);
    auto save = [&] {
        return kviCsRdrSaveSensorParmControl(DOM, rid, &sensor.Rdr, &sensor.Table, sensor.State);
    };
    auto restore = [&] {
        return kviCsRdrRestoreSensor(DOM, rid, SAHPI_FALSE, &sensor.Rdr, &sensor.Table,
                                     sensor.State);
    };
    KviLogCapture log;

    // The set of the enables is logged as fatal, yet the daemon goes on.
    sensor.State->SetResult = SA_ERR_HPI_BUSY;
    sensor.Table.SensorThresholdsSet = nullptr;
    EXPECT_EQ(restore(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("SensorThresholdsSet is NULL."));
    sensor.Table = sensorTable();
    EXPECT_EQ(restore(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to restore Sensor Thresholds returned " +
                             std::to_string(SA_ERR_HPI_BUSY)));
    sensor.Table.SensorThresholdsSet = thresholdsSet;
    sensor.Rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold = SAHPI_FALSE;
    EXPECT_EQ(restore(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_ERR_FATAL_NUM,
                 "kviIsSensorEventEnablesSet failed. rc=" + std::to_string(SA_ERR_HPI_BUSY)));
    sensor.Table.SensorEventEnablesSet = nullptr;
    EXPECT_EQ(restore(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("SensorEventEnablesSet is NULL."));

    // Reads: an empty get slot is a failed read, not a crash.
    sensor.Rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold = SAHPI_TRUE;
    sensor.Table.SensorThresholdsGet = nullptr;
    EXPECT_EQ(save(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviIsSensorThresholdsGet failed. rc " +
                             std::to_string(SA_ERR_HPI_INVALID_CMD)));
    sensor.Table = sensorTable();
    sensor.State->GetResult = SA_ERR_HPI_BUSY;
    sensor.Rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold = SAHPI_FALSE;
    EXPECT_EQ(save(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("kviIsSensorEventEnablesGet failed. rc " + std::to_string(SA_ERR_HPI_BUSY)));

    // A resource that is gone.
    EXPECT_EQ(kviCsRdrSaveSensorParmControl(DOM, 0xDEAD, &sensor.Rdr, &sensor.Table, sensor.State),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsRptActiveEntryGetByRid failed."));
}

TEST_F(ParmControlUnitTest, SensorStoreFailuresAreErrors)
{
    Record sensor = thresholdSensor();
    SaHpiResourceIdT rid = addResource({&sensor});
    kviCsNvFileOps.writeFile = failingWrite;
    KviLogCapture log;
    writesUntilFailure = 1;
    EXPECT_EQ(kviCsRdrSaveSensorParmControl(DOM, rid, &sensor.Rdr, &sensor.Table, sensor.State),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviIsSaveThreshNV failed. rc=" + std::to_string(SA_ERR_HPI_ERROR)));
    writesUntilFailure = 2;
    EXPECT_EQ(kviCsRdrSaveSensorParmControl(DOM, rid, &sensor.Rdr, &sensor.Table, sensor.State),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("kviIsSaveEvtEnablesNV failed. rc=" + std::to_string(SA_ERR_HPI_ERROR)));

    // A saved value that cannot be read is not the same as none saved.
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    std::string key = rdrKey(KVI_NVKEY_SENSOR_THRESH_PREFIX, 0, rid, 1);
    ASSERT_EQ(kviCsNonVolatilePut(key.c_str(), 3, "abc"), SA_OK);
    EXPECT_EQ(
        kviCsRdrRestoreSensor(DOM, rid, SAHPI_FALSE, &sensor.Rdr, &sensor.Table, sensor.State),
        SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to get sensor thresholds from NV"));
}

TEST_F(ParmControlUnitTest, SensorDefaultsRefuseNullArguments)
{
    Record sensor = thresholdSensor();
    KviLogCapture log;
    for (SaErrorT rc : {
             kviCsRdrSaveSensorParmControl(DOM, 1, nullptr, &sensor.Table, sensor.State),
             kviCsRdrSaveSensorParmControl(DOM, 1, &sensor.Rdr, nullptr, sensor.State),
             kviCsRdrSaveSensorParmControl(DOM, 1, &sensor.Rdr, &sensor.Table, nullptr),
             kviCsRdrRestoreSensor(DOM, 1, SAHPI_FALSE, nullptr, &sensor.Table, sensor.State),
             kviCsRdrRestoreSensor(DOM, 1, SAHPI_FALSE, &sensor.Rdr, nullptr, sensor.State),
             kviCsRdrRestoreSensor(DOM, 1, SAHPI_FALSE, &sensor.Rdr, &sensor.Table, nullptr),
             kviCsRptSaveParmControl(DOM, 1, nullptr, nullptr),
             kviCsRptRestoreParmControl(DOM, 1, nullptr, nullptr, SAHPI_FALSE),
         })
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(log.matching("Rdr pointer is NULL.").size(), 2u);
    EXPECT_EQ(log.matching("FnTable pointer is NULL.").size(), 4u);
    EXPECT_EQ(log.matching("UserData pointer is NULL.").size(), 2u);
    EXPECT_TRUE(calls.empty());
}

} // namespace
