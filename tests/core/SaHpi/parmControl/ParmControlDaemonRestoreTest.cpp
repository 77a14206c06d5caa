#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

class DaemonRestoreTest : public ParmControlTest
{
  protected:
    Record sensor(SaHpiSensorThdMaskT Writable = 0x3F)
    {
        return {sensorRdr(SAHPI_TRUE, SAHPI_SEC_PER_EVENT, Writable), sensorTable(), fake()};
    }
    Record control(SaHpiBoolT Ignore = SAHPI_FALSE)
    {
        return {ctrlRdr(SAHPI_CTRL_TYPE_DISCRETE, Ignore), ctrlTable(), fake()};
    }

    // What an HPI call that changed the settings left in the store.
    void changedThroughTheApi(SaHpiResourceIdT Rid, SaHpiBoolT Flag, const char *Tag,
                              SaHpiSeverityT Severity)
    {
        SaHpiTextBufferT tag = text(Tag);
        ASSERT_EQ(kviCsSaveResTagNV(DOM, Rid, Flag, &tag), SA_OK);
        ASSERT_EQ(kviCsSaveResSeverityNV(DOM, Rid, Flag, &Severity), SA_OK);
    }
    void changedSensor(SaHpiResourceIdT Rid, SaHpiSensorNumT Num, SaHpiBoolT Flag,
                       SaHpiUint32T Base, SaHpiEventStateT Assert)
    {
        SaHpiSensorThresholdsT th = thresholds(Base);
        SaHpiSensorEvtEnablesT enables{SAHPI_SENSTAT_EVENTS_ENABLED, Assert, 0};
        ASSERT_EQ(kviCsSaveThreshNV(DOM, Rid, Num, Flag, &th), SA_OK);
        ASSERT_EQ(kviCsSaveEvtEnablesNV(DOM, Rid, Num, Flag, &enables), SA_OK);
    }
    void changedControl(SaHpiResourceIdT Rid, SaHpiCtrlNumT Num, SaHpiBoolT Flag,
                        SaHpiCtrlStateDiscreteT Value)
    {
        SaHpiCtrlStateT state{SAHPI_CTRL_TYPE_DISCRETE, {}};
        state.StateUnion.Discrete = Value;
        ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, Rid, Num, Flag, &state), SA_OK);
    }
};

TEST_F(DaemonRestoreTest, PutsBackTheDaemonsCopyOnEveryActiveResource)
{
    Record s = sensor(), c = control();
    SaHpiResourceIdT first = addResource({&s, &c}, "discovered one", SAHPI_MINOR);
    SaHpiResourceIdT second = addResource({}, "discovered two", SAHPI_MINOR);
    changedThroughTheApi(first, SAHPI_TRUE, "changed one", SAHPI_CRITICAL);
    changedSensor(first, 1, SAHPI_TRUE, 40, 0x5);
    changedControl(first, 2, SAHPI_TRUE, 77);
    changedThroughTheApi(second, SAHPI_TRUE, "changed two", SAHPI_MAJOR);
    restartStore();

    KviLogCapture log;
    ASSERT_EQ(kviCsDaemonRestoreDomain(DOM), SA_OK);
    EXPECT_EQ(str(entry(first).ResourceTag), "changed one");
    EXPECT_EQ(entry(first).ResourceSeverity, SAHPI_CRITICAL);
    EXPECT_EQ(str(entry(second).ResourceTag), "changed two");
    EXPECT_EQ(entry(second).ResourceSeverity, SAHPI_MAJOR);
    SaHpiSensorThresholdsT expected = thresholds(40);
    EXPECT_TRUE(same(&s.State->Thresholds, &expected, sizeof expected));
    EXPECT_EQ(s.State->Enables.AssertEvents, 0x5);
    EXPECT_EQ(s.State->CapabilitiesSeen, entry(first).ResourceCapabilities);
    EXPECT_EQ(c.State->Ctrl.StateUnion.Discrete, 77u);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_L_NUM,
                 "Calling kviIsParmControlDeamonRestore Dom 0, ResId " + std::to_string(first)));
}

// Only settings changed through the API are put back: a resource never
// touched keeps what its plug-in reported, and an explicit save's copy is
// not the daemon's.
TEST_F(DaemonRestoreTest, SettingsNeverChangedKeepWhatThePlugInReported)
{
    Record s = sensor(), c = control();
    s.State->Thresholds = thresholds(1);
    c.State->Ctrl.StateUnion.Discrete = 3;
    SaHpiResourceIdT rid = addResource({&s, &c}, "discovered", SAHPI_MINOR);
    changedThroughTheApi(rid, SAHPI_FALSE, "explicitly saved", SAHPI_CRITICAL);
    changedSensor(rid, 1, SAHPI_FALSE, 90, 0x1);
    changedControl(rid, 2, SAHPI_FALSE, 99);

    KviLogCapture log;
    ASSERT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_OK);
    EXPECT_EQ(str(entry(rid).ResourceTag), "discovered");
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MINOR);
    EXPECT_TRUE(calls.empty());
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM, "resource tag was not saved. cannot restore"));
    EXPECT_FALSE(log.contains("kviCsNonVolatileGet failed"));
}

TEST_F(DaemonRestoreTest, AnIgnoredControlKeepsItsState)
{
    Record ignored = control(SAHPI_TRUE);
    ignored.State->Ctrl.StateUnion.Discrete = 4;
    SaHpiResourceIdT rid = addResource({&ignored});
    changedControl(rid, 1, SAHPI_TRUE, 8);
    ASSERT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_OK);
    EXPECT_EQ(ignored.State->Ctrl.StateUnion.Discrete, 4u);
    EXPECT_TRUE(calls.empty());
}

// Within a resource the first failure stops it; the domain walk goes on.
TEST_F(DaemonRestoreTest, AFailingResourceDoesNotStopTheOthers)
{
    Record failing = sensor(), later = sensor();
    failing.State->SetResult = SA_ERR_HPI_BUSY;
    SaHpiResourceIdT bad = addResource({&failing, &later});
    SaHpiResourceIdT good = addResource({}, "before");
    changedSensor(bad, 1, SAHPI_TRUE, 10, 0x1);
    changedSensor(bad, 2, SAHPI_TRUE, 20, 0x2);
    changedThroughTheApi(good, SAHPI_TRUE, "after", SAHPI_OK);

    KviLogCapture log;
    ASSERT_EQ(kviCsDaemonRestoreDomain(DOM), SA_OK);
    EXPECT_EQ(str(entry(good).ResourceTag), "after");
    EXPECT_EQ(later.State->Thresholds.UpMajor.Raw, 0u);
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreSensorThresh Failed. rc " +
                             std::to_string(SA_ERR_HPI_ERROR)));
    EXPECT_TRUE(
        log.contains("kviIsParmControlDeamonRestore returned " + std::to_string(SA_ERR_HPI_ERROR)));

    // A failing event-enable set and a failing control set are reported too.
    failing.State->SetResult = SA_OK;
    later.State->SetResult = SA_ERR_HPI_BUSY;
    later.Rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold = SAHPI_FALSE;
    EXPECT_EQ(kviCsDeamonRestoreEventEnables(DOM, bad, 2, &later.Rdr, &later.Table, later.State),
              SA_ERR_HPI_ERROR);
    Record c = control();
    c.State->SetResult = SA_ERR_HPI_BUSY;
    SaHpiResourceIdT withControl = addResource({&c});
    changedControl(withControl, 1, SAHPI_TRUE, 5);
    EXPECT_EQ(kviCsParmControlDeamonRestore(DOM, withControl), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("kviCsDeamonRestoreCtrlState Failed. rc " + std::to_string(SA_ERR_HPI_ERROR)));
}

TEST_F(DaemonRestoreTest, ADamagedSavedValueFailsItsResource)
{
    SaHpiResourceIdT rid = addResource({}, "discovered");
    KviLogCapture log;
    SaHpiTextBufferT tag = text("long enough");
    ASSERT_EQ(kviCsNonVolatilePut(rptKey(KVI_NVKEY_RESOURCE_TAG_PREFIX, 1, rid).c_str(), 12, &tag),
              SA_OK);
    EXPECT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM, "bytesRead did not match TextBuffer size."));
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreResourceTag failed. rc=" +
                             std::to_string(SA_ERR_HPI_ERROR)));
    EXPECT_EQ(str(entry(rid).ResourceTag), "discovered");

    ASSERT_EQ(kviCsNonVolatileDelete(rptKey(KVI_NVKEY_RESOURCE_TAG_PREFIX, 1, rid).c_str()), SA_OK);
    ASSERT_EQ(
        kviCsNonVolatilePut(rptKey(KVI_NVKEY_RESOURCE_SEVERITY_PREFIX, 1, rid).c_str(), 1, "x"),
        SA_OK);
    EXPECT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreResourceSeverity failed. rc=" +
                             std::to_string(SA_ERR_HPI_ERROR)));
}

TEST_F(DaemonRestoreTest, ADomainWithoutActiveResourcesIsAnError)
{
    KviLogCapture log;
    EXPECT_EQ(kviCsDaemonRestoreDomain(DOM), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        log.contains("kviCsRptActiveEntryGet returned " + std::to_string(SA_ERR_HPI_NOT_PRESENT)));
}

TEST_F(DaemonRestoreTest, RecordRestoresRefuseNullRecordsAndTables)
{
    Record s = sensor();
    for (SaErrorT rc : {
             kviCsDeamonRestoreSensorThresh(DOM, 1, 1, nullptr, &s.Table, s.State),
             kviCsDeamonRestoreSensorThresh(DOM, 1, 1, &s.Rdr, nullptr, s.State),
             kviCsDeamonRestoreEventEnables(DOM, 1, 1, nullptr, &s.Table, s.State),
             kviCsDeamonRestoreEventEnables(DOM, 1, 1, &s.Rdr, nullptr, s.State),
             kviCsDeamonRestoreCtrlState(DOM, 1, 1, nullptr, &s.Table, s.State),
             kviCsDeamonRestoreCtrlState(DOM, 1, 1, &s.Rdr, nullptr, s.State),
         })
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
}

} // namespace
