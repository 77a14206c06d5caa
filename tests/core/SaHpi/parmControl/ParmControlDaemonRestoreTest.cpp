#include <cstdlib>
#include <map>

#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
using namespace pctest;

// ---------------------------------------------------------------------------
// A restart of the daemon on the simulator plug-in.
//
// Each run of the daemon is a child process forked before this process
// touched the library (death-test suites run first), so the second run meets
// the library as a restarted daemon does: empty tables, resource ids counted
// from 1 again, and only the store's directory left from the first run.

// The test program links the library statically; the simulator resolves its
// library names against the program, so each one it uses must be linked in.
[[maybe_unused]] volatile const void *const SimulatorImports[] = {
    reinterpret_cast<const void *>(&kviCsCfgDataUint32Get),
    reinterpret_cast<const void *>(&kviCsDefaultEirSet),
    reinterpret_cast<const void *>(&kviCsDefaultWatchdogSet),
    reinterpret_cast<const void *>(&kviCsRdrAdd),
    reinterpret_cast<const void *>(&kviCsRdrGetSensor),
    reinterpret_cast<const void *>(&kviCsRdrGetWatchdog),
    reinterpret_cast<const void *>(&kviCsRptEntryActiveStateSetByRid),
    reinterpret_cast<const void *>(&kviCsRptEntryAdd),
    reinterpret_cast<const void *>(&kviCsRptEntryGetByRid),
    reinterpret_cast<const void *>(&kviCsRptEntryModifyByRid),
    reinterpret_cast<const void *>(&kviCsRptEntryRemoveByRid),
    reinterpret_cast<const void *>(&kviDsMaplManagerGetMaplLock),
    reinterpret_cast<const void *>(&kviCsGetSaHpiTime),
    reinterpret_cast<const void *>(&kviCsMalloc),
    reinterpret_cast<const void *>(&kviCsFree),
    reinterpret_cast<const void *>(&kviCsLogger),
};

std::string simulatorPath()
{
    const char *dir = getenv("KVI_TEST_BINARY_DIR");
    return std::string(dir != nullptr ? dir : ".") + "/../plugins/libKviSimulator.so";
}

// The shelf as the library's tables show it, by resource tag and record
// name, with what is needed to drive each record through its table.
class Shelf
{
  public:
    struct Record {
        SaHpiRdrT Rdr;
        KviDsRdrFnTable Fn;
        void *UserData;
    };

    Shelf()
    {
        SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
        while (entry != SAHPI_LAST_ENTRY) {
            SaHpiRptEntryT rpt{};
            if (kviCsRptActiveEntryGet(0, entry, &entry, &rpt, nullptr) != SA_OK) {
                ADD_FAILURE() << "no resources";
                return;
            }
            rids_[str(rpt.ResourceTag)] = rpt.ResourceId;
            SaHpiEntryIdT rdr = SAHPI_FIRST_ENTRY;
            while (rdr != SAHPI_LAST_ENTRY) {
                Record r{};
                SaHpiBoolT active = SAHPI_FALSE;
                if (kviCsRdrGet(0, rpt.ResourceId, SAHPI_NO_RECORD, rdr, &rdr, &r.Rdr, &active,
                                &r.UserData, &r.Fn, nullptr, nullptr) != SA_OK)
                    break;
                records_[{rpt.ResourceId, str(r.Rdr.IdString)}] = r;
            }
        }
    }

    SaHpiResourceIdT rid(const std::string &Tag) const
    {
        auto it = rids_.find(Tag);
        EXPECT_NE(it, rids_.end()) << Tag;
        return it == rids_.end() ? 0 : it->second;
    }
    // A record that is not there is a failure, and the callers then leave it
    // alone rather than call through an empty table.
    Record *rec(SaHpiResourceIdT Rid, const std::string &Name)
    {
        auto it = records_.find({Rid, Name});
        EXPECT_NE(it, records_.end()) << Name;
        return it == records_.end() ? nullptr : &it->second;
    }

    SaHpiSensorThresholdsT thresholds(SaHpiResourceIdT Rid, const std::string &Name)
    {
        Record *r = rec(Rid, Name);
        SaHpiSensorThresholdsT t{};
        if (r == nullptr)
            return t;
        EXPECT_EQ(r->Fn.SensorThresholdsGet(0, Rid, r->Rdr.RdrTypeUnion.SensorRec.Num, &r->Rdr,
                                            r->UserData, &t),
                  SA_OK);
        return t;
    }
    SaHpiSensorEvtEnablesT enables(SaHpiResourceIdT Rid, const std::string &Name)
    {
        Record *r = rec(Rid, Name);
        SaHpiSensorEvtEnablesT e{};
        if (r == nullptr)
            return e;
        EXPECT_EQ(r->Fn.SensorEventEnablesGet(0, Rid, r->Rdr.RdrTypeUnion.SensorRec.Num,
                                              r->UserData, 0,
                                              r->Rdr.RdrTypeUnion.SensorRec.Category, &e),
                  SA_OK);
        return e;
    }
    SaHpiCtrlStateT control(SaHpiResourceIdT Rid, const std::string &Name)
    {
        Record *r = rec(Rid, Name);
        SaHpiCtrlStateT s{};
        if (r == nullptr)
            return s;
        s.Type = r->Rdr.RdrTypeUnion.CtrlRec.Type;
        EXPECT_EQ(r->Fn.ControlStateGet(0, Rid, r->Rdr.RdrTypeUnion.CtrlRec.Num, r->UserData, &s),
                  SA_OK);
        return s;
    }

    // What saHpiSensorThresholdsSet, saHpiSensorEventEnablesSet and
    // saHpiControlStateSet do once the plug-in has taken the value: keep the
    // daemon's copy.
    void setThresholds(SaHpiResourceIdT Rid, const std::string &Name, SaHpiSensorThresholdsT T,
                       bool KeepDaemonCopy = true)
    {
        Record *r = rec(Rid, Name);
        if (r == nullptr)
            return;
        SaHpiSensorNumT num = r->Rdr.RdrTypeUnion.SensorRec.Num;
        ASSERT_EQ(r->Fn.SensorThresholdsSet(0, Rid, num, &r->Rdr, &T, r->UserData), SA_OK);
        if (KeepDaemonCopy) {
            ASSERT_EQ(kviCsSaveThreshNV(0, Rid, num, SAHPI_TRUE, &T), SA_OK);
        }
    }
    void setEnables(SaHpiResourceIdT Rid, const std::string &Name, SaHpiSensorEvtEnablesT E)
    {
        Record *r = rec(Rid, Name);
        if (r == nullptr)
            return;
        SaHpiSensorNumT num = r->Rdr.RdrTypeUnion.SensorRec.Num;
        ASSERT_EQ(r->Fn.SensorEventEnablesSet(0, Rid, num, &E, &r->Rdr, 0, r->UserData), SA_OK);
        ASSERT_EQ(kviCsSaveEvtEnablesNV(0, Rid, num, SAHPI_TRUE, &E), SA_OK);
    }
    void setControl(SaHpiResourceIdT Rid, const std::string &Name, SaHpiCtrlStateT S,
                    bool KeepDaemonCopy = true)
    {
        Record *r = rec(Rid, Name);
        if (r == nullptr)
            return;
        SaHpiCtrlNumT num = r->Rdr.RdrTypeUnion.CtrlRec.Num;
        ASSERT_EQ(r->Fn.ControlStateSet(0, Rid, num, &S, r->UserData), SA_OK);
        if (KeepDaemonCopy) {
            ASSERT_EQ(kviCsSaveCtrlStateNV(0, Rid, num, SAHPI_TRUE, &S), SA_OK);
        }
    }

    // An explicit save or restore of a resource and its sensors and
    // controls through the library's ready-made slots.
    void explicitly(SaHpiResourceIdT Rid, bool Save)
    {
        KviDsRptFnTable fn{};
        void *user = nullptr;
        ASSERT_EQ(kviCsRptActiveEntryGetByRid(0, Rid, nullptr, &fn, &user, nullptr, nullptr),
                  SA_OK);
        EXPECT_EQ(Save ? kviCsRptSaveParmControl(0, Rid, &fn, user)
                       : kviCsRptRestoreParmControl(0, Rid, &fn, user, SAHPI_FALSE),
                  SA_OK);
        for (auto &[key, r] : records_) {
            if (key.first != Rid)
                continue;
            SCOPED_TRACE(key.second);
            SaErrorT rc = SA_OK;
            if (r.Rdr.RdrType == SAHPI_SENSOR_RDR)
                rc = Save ? kviCsRdrSaveSensorParmControl(0, Rid, &r.Rdr, &r.Fn, r.UserData)
                          : kviCsRdrRestoreSensor(0, Rid, SAHPI_FALSE, &r.Rdr, &r.Fn, r.UserData);
            else if (r.Rdr.RdrType == SAHPI_CTRL_RDR)
                rc = Save ? kviCsRdrSaveCtrlParmControl(0, Rid, &r.Rdr, &r.Fn, r.UserData)
                          : kviCsRdrRestoreCtrl(0, Rid, SAHPI_FALSE, &r.Rdr, &r.Fn, r.UserData);
            EXPECT_EQ(rc, SA_OK);
        }
    }

  private:
    std::map<std::string, SaHpiResourceIdT> rids_;
    std::map<std::pair<SaHpiResourceIdT, std::string>, Record> records_;
};

SaHpiCtrlStateT analog(SaHpiCtrlStateAnalogT Value)
{
    SaHpiCtrlStateT s{SAHPI_CTRL_TYPE_ANALOG, {}};
    s.StateUnion.Analog = Value;
    return s;
}

SaHpiCtrlStateT discrete(SaHpiCtrlStateDiscreteT Value)
{
    SaHpiCtrlStateT s{SAHPI_CTRL_TYPE_DISCRETE, {}};
    s.StateUnion.Discrete = Value;
    return s;
}

SaHpiSensorThresholdsT upperLimits(SaHpiUint32T Minor, SaHpiUint32T Major)
{
    SaHpiSensorThresholdsT t{};
    t.UpMinor = reading(Minor);
    t.UpMajor = reading(Major);
    return t;
}

// One run of the daemon: start, discover, the scenario, stop.
template <typename Scenario> void daemonRun(const std::string &Config, Scenario scenario)
{
    EXPECT_EXIT(
        {
            KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
            EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, Config.c_str()), SA_OK);
            EXPECT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
            SaHpiVersionT version = 0;
            SaHpiSessionIdT session = 0;
            EXPECT_EQ(saHpiInitialize(&version), SA_OK);
            EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr), SA_OK);
            EXPECT_EQ(saHpiResourcesDiscover(session), SA_OK);
            scenario();
            EXPECT_EQ(saHpiFinalize(), SA_OK);
            // The parent shows the child's standard error when it fails.
            const testing::TestResult *result =
                testing::UnitTest::GetInstance()->current_test_info()->result();
            for (int i = 0; i < result->total_part_count(); i++)
                if (result->GetTestPartResult(i).failed())
                    fprintf(stderr, "%s\n", result->GetTestPartResult(i).message());
            for (const std::string &line : log.lines())
                fprintf(stderr, "%s\n", line.c_str());
            exit(testing::Test::HasFailure() ? 1 : 0);
        },
        testing::ExitedWithCode(0), "");
}

TEST(DaemonRestoreDeathTest, ARestartedDaemonPutsBackWhatClientsChangedOnTheSimulator)
{
    KviTempDir dir;
    const std::string config =
        dir.write("kvi.conf", "mapl_modules = \"" + simulatorPath() + "\"\nKviNvStorageDir = \"" +
                                  dir.file("nv") +
                                  "\"\nmax_mapl_count = \"2\"\nmax_mapl_rwlocks_count = \"2\"\n");

    daemonRun(config, [] {
        Shelf shelf;
        SaHpiResourceIdT chassis = shelf.rid("Chassis 1"), board = shelf.rid("Processor board 1");
        ASSERT_TRUE(chassis != 0 && board != 0);

        // The operating mode and a 12V limit change on the plug-in's side,
        // not through an HPI call, so the daemon keeps no copy of them; an
        // operator then saves the chassis and the board explicitly.
        shelf.setControl(chassis, "Operating mode", discrete(3), false);
        shelf.setThresholds(board, "Board 12V", upperLimits(208, 210), false);
        shelf.explicitly(chassis, true);
        shelf.explicitly(board, true);

        // Clients then change settings through the HPI calls.
        SaHpiTextBufferT tag = text("Rack 7 chassis");
        EXPECT_EQ(kviCsRptEntryModifyTagByRid(0, chassis, &tag), SA_OK);
        EXPECT_EQ(kviCsRptEntryModifySeverityByRid(0, chassis, SAHPI_MINOR), SA_OK);
        shelf.setThresholds(chassis, "Inlet temperature", upperLimits(36, 42));
        shelf.setEnables(chassis, "Inlet temperature",
                         {SAHPI_SENSTAT_EVENTS_ENABLED,
                          SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR | SAHPI_ES_UPPER_CRIT,
                          SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR | SAHPI_ES_UPPER_CRIT});
        shelf.setControl(chassis, "Display brightness", analog(30));
    });

    daemonRun(config, [] {
        Shelf shelf;
        SaHpiResourceIdT chassis = shelf.rid("Chassis 1"), board = shelf.rid("Processor board 1");
        ASSERT_TRUE(chassis != 0 && board != 0);
        // The plug-in starts from its own defaults.
        EXPECT_EQ(shelf.control(chassis, "Display brightness").StateUnion.Analog, 75);
        EXPECT_EQ(shelf.thresholds(chassis, "Inlet temperature").UpMajor.Raw, 40u);

        // The daemon's copy comes back; the explicit save's does not.
        ASSERT_EQ(kviCsDaemonRestoreDomain(0), SA_OK);
        SaHpiRptEntryT entry{};
        SaHpiBoolT active = SAHPI_FALSE;
        ASSERT_EQ(kviCsRptEntryGetByRid(0, chassis, &entry, &active, nullptr), SA_OK);
        EXPECT_EQ(str(entry.ResourceTag), "Rack 7 chassis");
        EXPECT_EQ(entry.ResourceSeverity, SAHPI_MINOR);
        SaHpiSensorThresholdsT inlet = shelf.thresholds(chassis, "Inlet temperature");
        EXPECT_EQ(inlet.UpMinor.Raw, 36u);
        EXPECT_EQ(inlet.UpMajor.Raw, 42u);
        EXPECT_EQ(inlet.UpCritical.Raw, 45u);
        EXPECT_EQ(shelf.enables(chassis, "Inlet temperature").AssertEvents,
                  SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR | SAHPI_ES_UPPER_CRIT);
        EXPECT_EQ(shelf.control(chassis, "Display brightness").StateUnion.Analog, 30);
        EXPECT_EQ(shelf.control(chassis, "Operating mode").StateUnion.Discrete, 1u);
        EXPECT_EQ(shelf.thresholds(board, "Board 12V").UpMinor.Raw, 207u);

        // An explicit restore goes back to what the operator saved.
        shelf.explicitly(chassis, false);
        shelf.explicitly(board, false);
        ASSERT_EQ(kviCsRptEntryGetByRid(0, chassis, &entry, &active, nullptr), SA_OK);
        EXPECT_EQ(str(entry.ResourceTag), "Chassis 1");
        EXPECT_EQ(entry.ResourceSeverity, SAHPI_CRITICAL);
        EXPECT_EQ(shelf.control(chassis, "Operating mode").StateUnion.Discrete, 3u);
        EXPECT_EQ(shelf.control(chassis, "Display brightness").StateUnion.Analog, 75);
        EXPECT_EQ(shelf.thresholds(chassis, "Inlet temperature").UpMajor.Raw, 40u);
        EXPECT_EQ(shelf.thresholds(board, "Board 12V").UpMinor.Raw, 208u);
    });
}

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
