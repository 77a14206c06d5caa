#include <algorithm>
#include <cerrno>

#include "core/utils/NonVolatileStorage.h"
#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

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

class ParmControlUnitTest : public ParmControlTest
{
  protected:
    void TearDown() override
    {
        kviCsNvFileOps = kviCsNvDefaultFileOps;
        ParmControlTest::TearDown();
    }
    void failWrite(int Nth)
    {
        kviCsNvFileOps.writeFile = failingWrite;
        writesUntilFailure = Nth;
    }

    SaErrorT parm(SaHpiResourceIdT Rid, int Action)
    {
        KviDsRptFnTable table{};
        void *user = nullptr;
        EXPECT_EQ(kviCsRptActiveEntryGetByRid(DOM, Rid, nullptr, &table, &user, nullptr, nullptr),
                  SA_OK);
        return kviCsParmControl(DOM, Rid, static_cast<SaHpiParmActionT>(Action), &table, user);
    }
    SaErrorT restoreRpt(SaHpiResourceIdT Rid, SaHpiBoolT Daemon, KviDsRptFnTable Table = rptTable())
    {
        return kviCsRptRestoreParmControl(DOM, Rid, &Table, resource(Rid), Daemon);
    }
    SaErrorT saveSensor(Record &S, SaHpiResourceIdT Rid)
    {
        return kviCsRdrSaveSensorParmControl(DOM, Rid, &S.Rdr, &S.Table, S.State);
    }
    SaErrorT restoreSensor(Record &S, SaHpiResourceIdT Rid, SaHpiBoolT Daemon)
    {
        return kviCsRdrRestoreSensor(DOM, Rid, Daemon, &S.Rdr, &S.Table, S.State);
    }
    static bool calledSlot(const std::string &Prefix)
    {
        return std::any_of(calls.begin(), calls.end(),
                           [&](const std::string &c) { return c.rfind(Prefix, 0) == 0; });
    }
};

// Save, change everything, restore: each setting is back, the resource's
// before its records'. A control's defaults come after the resource's slot.
TEST_F(ParmControlUnitTest, RestoreBringsBackWhatSaveKeptAndDefaultsComeFromTheRecords)
{
    Record sensor = this->sensor(), ctrl = control(SAHPI_CTRL_TYPE_ANALOG);
    sensor.State->Thresholds = thresholds(10);
    sensor.State->Enables = {SAHPI_SENSTAT_EVENTS_ENABLED, 0x11, 0x22};
    ctrl.State->Ctrl.Type = SAHPI_CTRL_TYPE_ANALOG;
    ctrl.State->Ctrl.StateUnion.Analog = 5;
    ctrl.Rdr.RdrTypeUnion.CtrlRec.TypeUnion.Analog.Default = -3;
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
    ctrl.State->Ctrl.StateUnion.Analog = 9;
    calls.clear();
    ASSERT_EQ(parm(rid, SAHPI_RESTORE_PARM), SA_OK);
    EXPECT_EQ(str(entry(rid).ResourceTag), "saved tag");
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MAJOR);
    EXPECT_EQ(resource(rid)->EventLog, SAHPI_FALSE);
    SaHpiSensorThresholdsT expected = thresholds(10);
    EXPECT_TRUE(same(&sensor.State->Thresholds, &expected, sizeof expected));
    EXPECT_EQ(sensor.State->Enables.AssertEvents, 0x11);
    EXPECT_EQ(sensor.State->CapabilitiesSeen, entry(rid).ResourceCapabilities);
    EXPECT_EQ(ctrl.State->Ctrl.StateUnion.Analog, 5);
    EXPECT_EQ(calls.front(), "EvtLogSet " + std::to_string(rid) + "/0");

    calls.clear();
    KviLogCapture log;
    ASSERT_EQ(parm(rid, SAHPI_DEFAULT_PARM), SA_OK);
    EXPECT_EQ(calls.front(), "RptDefault " + std::to_string(rid) + "/0");
    EXPECT_EQ(ctrl.State->Ctrl.StateUnion.Analog, -3);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Restore default parm control"));
    EXPECT_TRUE(log.contains("RdrDefaultParmControl is NULL. Skipping RDR."));
}

TEST_F(ParmControlUnitTest, NullArgumentsUnknownActionsAndEmptySlots)
{
    Record sensor = this->sensor();
    sensor.Table.RdrSaveParmControl = nullptr;
    sensor.Table.RdrRestoreParmControl = nullptr;
    SaHpiResourceIdT rid = addResource({&sensor}, "t", SAHPI_OK, KviDsRptFnTable{});
    KviDsRptFnTable table = rptTable();
    int user = 0;
    KviLogCapture log;
    EXPECT_EQ(kviCsParmControl(DOM, rid, SAHPI_SAVE_PARM, nullptr, &user),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsParmControl(DOM, rid, SAHPI_SAVE_PARM, &table, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(parm(rid, 3), SA_ERR_HPI_INVALID_PARAMS);
    // An action out of range is met again at the first record that takes part.
    EXPECT_EQ(kviCsRdrPerformParmAction(DOM, rid, static_cast<SaHpiParmActionT>(3)),
              SA_ERR_HPI_INVALID_PARAMS);
    for (int action : {SAHPI_DEFAULT_PARM, SAHPI_SAVE_PARM, SAHPI_RESTORE_PARM})
        EXPECT_EQ(parm(rid, action), SA_OK);
    EXPECT_TRUE(calls.empty());
    for (const char *line :
         {"FnTable pointer is NULL.", "UserDefined pointer is NULL.", "Invalid Parm Action 3",
          "Invalid Parm Control Action",
          "RptDefaultParmControl is NULL. Skipping RPT entry default parm control restore.",
          ">RptSaveParmControl is NULL. Skipping RPT entry save parm control",
          ">RptRestoreParmControl is NULL. Skipping RPT entry restore parm control",
          "RdrSaveParmControl is NULL. Skipping RDR.",
          "RdrRestoreParmControl is NULL. Skipping RDR."})
        EXPECT_TRUE(log.contains(line)) << line;
}

// A failing resource slot leaves the records alone; records are walked in
// the table's order (3, 1, 2 for three) and the first failure ends the walk,
// what was done before it staying done. A resource without records, and
// records other than sensors, controls and inventories, are passed over.
TEST_F(ParmControlUnitTest, FailuresEndTheActionWhereTheyHappen)
{
    Record one = sensor(), two = sensor(), three = sensor(), watchdog = sensor();
    watchdog.Rdr.RdrType = SAHPI_WATCHDOG_RDR;
    one.State->GetResult = SA_ERR_HPI_INVALID_DATA;
    SaHpiResourceIdT rid = addResource({&one, &two, &three});
    const std::string r = std::to_string(rid);
    KviLogCapture log;
    resource(rid)->GetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_ERR_HPI_BUSY);
    EXPECT_FALSE(calledSlot("ThresholdsGet"));
    resource(rid)->GetResult = SA_OK;
    EXPECT_EQ(parm(rid, SAHPI_SAVE_PARM), SA_ERR_HPI_ERROR);
    SaHpiSensorThresholdsT th{};
    EXPECT_EQ(kviCsGetThreshNV(DOM, rid, 3, SAHPI_FALSE, &th), SA_OK);
    EXPECT_EQ(kviCsGetThreshNV(DOM, rid, 2, SAHPI_FALSE, &th), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_FALSE(calledSlot("ThresholdsGet " + r + "/2"));
    for (const std::string &line : std::vector<std::string>{
             "EventLogStateGet failed. rc=-1003", "RptSaveParmControl failed. rc=-1003, rid=" + r,
             "kviIsSensorThresholdsGet failed. rc -1012", "RdrSaveParmControl failed. rc -1001",
             "kviCsRdrPerformParmAction failed. rc=-1001, rid=" + r})
        EXPECT_TRUE(log.contains(line)) << line;

    SaHpiResourceIdT lonely = addResource({}, "lonely"), other = addResource({&watchdog});
    calls.clear();
    ASSERT_EQ(parm(lonely, SAHPI_SAVE_PARM), SA_OK);
    EXPECT_TRUE(log.contains("No RDRs exist. Returning OK"));
    SaHpiTextBufferT tag{};
    EXPECT_EQ(kviCsGetResTagNV(DOM, lonely, SAHPI_FALSE, &tag), SA_OK);
    EXPECT_EQ(str(tag), "lonely");
    ASSERT_EQ(kviCsRdrPerformParmAction(DOM, other, SAHPI_SAVE_PARM), SA_OK);
    EXPECT_TRUE(log.contains("Ignoring Rdr. Type 4"));
    EXPECT_EQ(calls.size(), 1u) << "only the lonely resource's event-log state was read";
}

// An explicit restore needs a save first and then every saved resource item;
// a daemon restore passes over what was never saved. The tag and the
// event-log state follow DaemonRestore, while the severity is read from the
// explicit save's copy whoever restores.
TEST_F(ParmControlUnitTest, ResourceRestoreReadsEachItemFromItsOwnCopy)
{
    Record sensor = this->sensor();
    SaHpiResourceIdT rid = addResource({&sensor}, "discovered", SAHPI_MINOR);
    KviLogCapture log;
    EXPECT_EQ(parm(rid, SAHPI_RESTORE_PARM), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Parm control restore was called without a save done first"));
    EXPECT_TRUE(log.contains("RptRestoreParmControl failed. rc=-1024"));
    EXPECT_EQ(restoreRpt(rid, SAHPI_TRUE), SA_OK);
    EXPECT_TRUE(calls.empty());

    SaHpiTextBufferT tag = text("daemon's tag");
    SaHpiSeverityT daemonSeverity = SAHPI_CRITICAL, explicitSeverity = SAHPI_MAJOR;
    ASSERT_EQ(kviCsSaveResTagNV(DOM, rid, SAHPI_TRUE, &tag), SA_OK);
    ASSERT_EQ(kviCsSaveResSeverityNV(DOM, rid, SAHPI_TRUE, &daemonSeverity), SA_OK);
    ASSERT_EQ(kviCsSaveEvtLogStNV(DOM, rid, SAHPI_TRUE, SAHPI_FALSE), SA_OK);
    ASSERT_EQ(restoreRpt(rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(str(entry(rid).ResourceTag), "daemon's tag");
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MINOR);
    EXPECT_EQ(resource(rid)->EventLog, SAHPI_FALSE);
    ASSERT_EQ(kviCsSaveResSeverityNV(DOM, rid, SAHPI_FALSE, &explicitSeverity), SA_OK);
    ASSERT_EQ(restoreRpt(rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MAJOR);

    // Explicitly: the tag alone, then with the severity, then all three with
    // a failing set slot, then with none.
    SaHpiResourceIdT bare = addResource({});
    ASSERT_EQ(kviCsSaveResTagNV(DOM, bare, SAHPI_FALSE, &tag), SA_OK);
    EXPECT_EQ(restoreRpt(bare, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not find severity"));
    ASSERT_EQ(kviCsSaveResSeverityNV(DOM, bare, SAHPI_FALSE, &explicitSeverity), SA_OK);
    EXPECT_EQ(restoreRpt(bare, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not restore event log state"));
    ASSERT_EQ(kviCsSaveEvtLogStNV(DOM, bare, SAHPI_FALSE, SAHPI_FALSE), SA_OK);
    resource(bare)->SetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(restoreRpt(bare, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not restore event log state. -1003"));
    KviDsRptFnTable noSet = rptTable();
    noSet.EventLogStateSet = nullptr;
    EXPECT_EQ(restoreRpt(bare, SAHPI_FALSE, noSet), SA_OK);
    EXPECT_TRUE(log.contains("EventLogStateSet is NULL."));
}

// Only the event-log state may fail to be stored without failing the save.
TEST_F(ParmControlUnitTest, AnUnstorableEventLogStateDoesNotFailTheSave)
{
    SaHpiResourceIdT rid = addResource({});
    KviDsRptFnTable table = rptTable();
    KviLogCapture log;
    const struct {
        int failingWrite;
        SaErrorT rc;
        const char *line;
    } cases[] = {{1, SA_OK, "kviCsSaveEvtLogStNV failed. rc=-1001"},
                 {2, SA_ERR_HPI_ERROR, "kviCsSaveResTagNV failed. rc=-1001"},
                 {3, SA_ERR_HPI_ERROR, "kviCsSaveResSeverityNV failed. rc=-1001"}};
    for (const auto &c : cases) {
        failWrite(c.failingWrite);
        EXPECT_EQ(kviCsRptSaveParmControl(DOM, rid, &table, resource(rid)), c.rc);
        EXPECT_TRUE(log.contains(c.line)) << c.line;
    }
    table.EventLogStateGet = nullptr;
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, rid, &table, resource(rid)), SA_OK);
    EXPECT_TRUE(log.contains("Event log state not saved"));
    EXPECT_EQ(kviCsRptSaveParmControl(DOM, 0xDEAD, &table, resource(rid)), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("kviCsRptActiveEntryGetByRid failed. rc=-1013"));
}

// Sensors without thresholds or events have nothing to save. Thresholds the
// record does not declare writable go back to the plug-in as zeroes, the
// hysteresis values as saved.
TEST_F(ParmControlUnitTest, OnlyWhatASensorDeclaresIsSavedAndOnlyWritableThresholdsRestored)
{
    Record plain = sensor(SAHPI_FALSE, SAHPI_SEC_NO_EVENTS);
    Record s = sensor(SAHPI_TRUE, SAHPI_SEC_PER_EVENT, SAHPI_STM_LOW_MINOR | SAHPI_STM_UP_CRIT);
    s.State->Thresholds = thresholds(20);
    SaHpiResourceIdT rid = addResource({&s, &plain});
    KviLogCapture log;
    EXPECT_EQ(saveSensor(plain, rid), SA_OK);
    EXPECT_EQ(restoreSensor(plain, rid, SAHPI_FALSE), SA_OK);
    EXPECT_TRUE(calls.empty());
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Sensor does not support thresholds. None Saved"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Sensor does not support events. None Saved"));

    ASSERT_EQ(saveSensor(s, rid), SA_OK);
    s.State->Thresholds = {};
    ASSERT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_OK);
    const SaHpiSensorThresholdsT &t = s.State->Thresholds;
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
    Record s = sensor();
    SaHpiResourceIdT rid = addResource({&s});
    SaHpiSensorThresholdsT daemonCopy = thresholds(100), explicitCopy = thresholds(200);
    SaHpiSensorEvtEnablesT daemonEnables{SAHPI_SENSTAT_EVENTS_ENABLED, 0x7, 0x7};
    ASSERT_EQ(kviCsSaveThreshNV(DOM, rid, 1, SAHPI_TRUE, &daemonCopy), SA_OK);
    ASSERT_EQ(kviCsSaveThreshNV(DOM, rid, 1, SAHPI_FALSE, &explicitCopy), SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_TRUE, &daemonEnables), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(s.State->Thresholds.UpMajor.Raw, 105u);
    EXPECT_FALSE(calledSlot("EnablesSet"));
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_EQ(s.State->Thresholds.UpMajor.Raw, 205u);
    EXPECT_TRUE(log.contains("Could not find events"));
    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_FALSE, &daemonEnables), SA_OK);
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(s.State->Enables.DeassertEvents, 0x7);
}

// Every failure of a sensor slot, the store or the resource's lookup is
// SA_ERR_HPI_ERROR; an empty get slot is a failed read, not a crash.
TEST_F(ParmControlUnitTest, SensorSlotAndStoreFailuresAreErrors)
{
    Record s = sensor();
    SaHpiResourceIdT rid = addResource({&s});
    SaHpiSensorThresholdsT th = thresholds(1);
    SaHpiSensorEvtEnablesT enables{};
    ASSERT_EQ(kviCsSaveThreshNV(DOM, rid, 1, SAHPI_FALSE, &th), SA_OK);
    ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, rid, 1, SAHPI_FALSE, &enables), SA_OK);
    SaHpiSensorRecT &rec = s.Rdr.RdrTypeUnion.SensorRec;
    KviLogCapture log;
    s.State->SetResult = SA_ERR_HPI_BUSY;
    s.Table.SensorThresholdsSet = nullptr;
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("SensorThresholdsSet is NULL."));
    s.Table = sensorTable();
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to restore Sensor Thresholds returned -1003"));
    rec.ThresholdDefn.IsThreshold = SAHPI_FALSE;
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    // Logged as fatal, yet the daemon goes on.
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_ERR_FATAL_NUM, "kviIsSensorEventEnablesSet failed. rc=-1003"));
    s.Table.SensorEventEnablesSet = nullptr;
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("SensorEventEnablesSet is NULL."));

    rec.ThresholdDefn.IsThreshold = SAHPI_TRUE;
    s.Table.SensorThresholdsGet = nullptr;
    EXPECT_EQ(saveSensor(s, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviIsSensorThresholdsGet failed. rc -1005"));
    s.Table = sensorTable();
    s.State->GetResult = SA_ERR_HPI_BUSY;
    rec.ThresholdDefn.IsThreshold = SAHPI_FALSE;
    EXPECT_EQ(saveSensor(s, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviIsSensorEventEnablesGet failed. rc -1003"));
    EXPECT_EQ(saveSensor(s, 0xDEAD), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsRptActiveEntryGetByRid failed."));

    s.State->GetResult = SA_OK;
    rec.ThresholdDefn.IsThreshold = SAHPI_TRUE;
    failWrite(1);
    EXPECT_EQ(saveSensor(s, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviIsSaveThreshNV failed. rc=-1001"));
    failWrite(2);
    EXPECT_EQ(saveSensor(s, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviIsSaveEvtEnablesNV failed. rc=-1001"));

    // A saved value that cannot be read is not the same as none saved.
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    ASSERT_EQ(
        kviCsNonVolatilePut(nvKey(KVI_NVKEY_SENSOR_THRESH_PREFIX, 0, rid, 1).c_str(), 3, "abc"),
        SA_OK);
    EXPECT_EQ(restoreSensor(s, rid, SAHPI_FALSE), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Failed to get sensor thresholds from NV"));
}

TEST_F(ParmControlUnitTest, DefaultSlotsRefuseNullArguments)
{
    Record s = sensor();
    KviLogCapture log;
    for (SaErrorT rc : {kviCsRdrSaveSensorParmControl(DOM, 1, nullptr, &s.Table, s.State),
                        kviCsRdrRestoreSensor(DOM, 1, SAHPI_FALSE, &s.Rdr, nullptr, s.State),
                        kviCsRdrSaveSensorParmControl(DOM, 1, &s.Rdr, &s.Table, nullptr),
                        kviCsRptSaveParmControl(DOM, 1, nullptr, nullptr),
                        kviCsRptRestoreParmControl(DOM, 1, nullptr, nullptr, SAHPI_FALSE)})
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(log.matching("Rdr pointer is NULL.").size(), 1u);
    EXPECT_EQ(log.matching("FnTable pointer is NULL.").size(), 3u);
    EXPECT_EQ(log.matching("UserData pointer is NULL.").size(), 1u);
    EXPECT_TRUE(calls.empty());
}

} // namespace
