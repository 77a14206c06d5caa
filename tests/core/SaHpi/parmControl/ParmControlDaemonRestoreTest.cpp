#include <map>

#include "tests/core/SaHpi/parmControl/ParmControlFixture.h"

namespace
{
// The session of the client whose calls the daemon runs make.
SaHpiSessionIdT clientSession = 0;

using namespace pctest;

// ---------------------------------------------------------------------------
// A restart of the daemon on the simulator plug-in.
//
// Each run of the daemon is a child process forked before this process
// touched the library (death-test suites run first), so the second run meets
// the library as a restarted daemon does: empty tables, resource ids counted
// from 1 again, and only the store's directory left from the first run.

// The shelf as the library's tables show it, by resource tag and record
// name, with what is needed to drive each record through its table. A name
// that is not there fails the test, and an empty record stands in for it.
class Shelf
{
  public:
    struct Record {
        SaHpiRdrT Rdr{};
        KviDsRdrFnTable Fn{};
        void *UserData = nullptr;
        SaHpiResourceIdT Rid = 0;
    };

    // Reads the tables; a failure here ends the scenario's checks early.
    void load()
    {
        for (SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY; entry != SAHPI_LAST_ENTRY;) {
            SaHpiRptEntryT rpt{};
            ASSERT_EQ(kviCsRptActiveEntryGet(0, entry, &entry, &rpt, nullptr), SA_OK);
            rids_[str(rpt.ResourceTag)] = rpt.ResourceId;
            Record r{};
            r.Rid = rpt.ResourceId;
            SaHpiBoolT active = SAHPI_FALSE;
            for (SaHpiEntryIdT rdr = SAHPI_FIRST_ENTRY;
                 rdr != SAHPI_LAST_ENTRY &&
                 kviCsRdrGet(0, r.Rid, SAHPI_NO_RECORD, rdr, &rdr, &r.Rdr, &active, &r.UserData,
                             &r.Fn, nullptr, nullptr) == SA_OK;)
                records_[{r.Rid, str(r.Rdr.IdString)}] = r;
        }
    }

    SaHpiResourceIdT rid(const std::string &Tag)
    {
        EXPECT_EQ(rids_.count(Tag), 1u) << Tag;
        return rids_[Tag];
    }
    Record &rec(SaHpiResourceIdT Rid, const std::string &Name)
    {
        EXPECT_EQ(records_.count({Rid, Name}), 1u) << Name;
        return records_[{Rid, Name}];
    }

    SaHpiSensorThresholdsT thresholds(SaHpiResourceIdT Rid, const std::string &Name)
    {
        Record &r = rec(Rid, Name);
        SaHpiSensorThresholdsT t{};
        if (r.Fn.SensorThresholdsGet != nullptr) {
            EXPECT_EQ(r.Fn.SensorThresholdsGet(0, Rid, num(r), &r.Rdr, r.UserData, &t), SA_OK);
        }
        return t;
    }
    SaHpiSensorEvtEnablesT enables(SaHpiResourceIdT Rid, const std::string &Name)
    {
        Record &r = rec(Rid, Name);
        SaHpiSensorEvtEnablesT e{};
        if (r.Fn.SensorEventEnablesGet != nullptr) {
            EXPECT_EQ(r.Fn.SensorEventEnablesGet(0, Rid, num(r), r.UserData, 0,
                                                 r.Rdr.RdrTypeUnion.SensorRec.Category, &e),
                      SA_OK);
        }
        return e;
    }
    SaHpiCtrlStateT control(SaHpiResourceIdT Rid, const std::string &Name)
    {
        Record &r = rec(Rid, Name);
        SaHpiCtrlStateT s{r.Rdr.RdrTypeUnion.CtrlRec.Type, {}};
        if (r.Fn.ControlStateGet != nullptr) {
            EXPECT_EQ(r.Fn.ControlStateGet(0, Rid, num(r), r.UserData, &s), SA_OK);
        }
        return s;
    }

    // A client's set through the HPI call, which keeps the daemon's copy, or
    // a change on the plug-in's own side, which keeps none.
    void setThresholds(SaHpiResourceIdT Rid, const std::string &Name, SaHpiSensorThresholdsT T,
                       bool ThroughTheApi = true)
    {
        Record &r = rec(Rid, Name);
        if (ThroughTheApi)
            ASSERT_EQ(saHpiSensorThresholdsSet(clientSession, Rid, num(r), &T), SA_OK);
        else
            ASSERT_EQ(r.Fn.SensorThresholdsSet(0, Rid, num(r), &r.Rdr, &T, r.UserData), SA_OK);
    }
    void setEnables(SaHpiResourceIdT Rid, const std::string &Name, SaHpiSensorEvtEnablesT E)
    {
        ASSERT_EQ(saHpiSensorEventEnablesSet(clientSession, Rid, num(rec(Rid, Name)), &E), SA_OK);
    }
    void setControl(SaHpiResourceIdT Rid, const std::string &Name, SaHpiCtrlStateT S,
                    bool ThroughTheApi = true)
    {
        Record &r = rec(Rid, Name);
        if (ThroughTheApi)
            ASSERT_EQ(saHpiControlStateSet(clientSession, Rid, num(r), &S), SA_OK);
        else
            ASSERT_EQ(r.Fn.ControlStateSet(0, Rid, num(r), &S, r.UserData), SA_OK);
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
            SCOPED_TRACE(key.second);
            if (key.first != Rid)
                continue;
            if (r.Rdr.RdrType == SAHPI_SENSOR_RDR) {
                EXPECT_EQ(Save ? kviCsRdrSaveSensorParmControl(0, Rid, &r.Rdr, &r.Fn, r.UserData)
                               : kviCsRdrRestoreSensor(0, Rid, 0, &r.Rdr, &r.Fn, r.UserData),
                          SA_OK);
            } else if (r.Rdr.RdrType == SAHPI_CTRL_RDR) {
                EXPECT_EQ(Save ? kviCsRdrSaveCtrlParmControl(0, Rid, &r.Rdr, &r.Fn, r.UserData)
                               : kviCsRdrRestoreCtrl(0, Rid, 0, &r.Rdr, &r.Fn, r.UserData),
                          SA_OK);
            }
        }
    }

  private:
    // Sensor and control numbers sit first in the record's union alike.
    static SaHpiUint8T num(const Record &R) { return R.Rdr.RdrTypeUnion.CtrlRec.Num; }

    std::map<std::string, SaHpiResourceIdT> rids_;
    std::map<std::pair<SaHpiResourceIdT, std::string>, Record> records_;
};

SaHpiCtrlStateT analog(SaHpiCtrlStateAnalogT Value)
{
    SaHpiCtrlStateT s{SAHPI_CTRL_TYPE_ANALOG, {}};
    s.StateUnion.Analog = Value;
    return s;
}

SaHpiSensorThresholdsT upperLimits(SaHpiUint32T Minor, SaHpiUint32T Major)
{
    SaHpiSensorThresholdsT t{};
    t.UpMinor = reading(Minor);
    t.UpMajor = reading(Major);
    return t;
}

// One run of the daemon: start, discover, the scenario, stop. The child's
// failed expectations and error lines go to its standard error, which the
// parent shows when the run fails.
template <typename Scenario> void daemonRun(const std::string &Config, Scenario scenario)
{
    EXPECT_EXIT(
        {
            KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
            EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, Config.c_str()), SA_OK);
            EXPECT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
            SaHpiVersionT version = 0;
            EXPECT_EQ(saHpiInitialize(&version), SA_OK);
            EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &clientSession, nullptr), SA_OK);
            EXPECT_EQ(saHpiResourcesDiscover(clientSession), SA_OK);
            Shelf shelf;
            shelf.load();
            scenario(shelf, shelf.rid("Chassis 1"), shelf.rid("Processor board 1"));
            EXPECT_EQ(saHpiFinalize(), SA_OK);
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
        dir.write("kvi.conf", "mapl_modules = \"" KVI_SIMULATOR_PATH "\"\nKviNvStorageDir = \"" +
                                  dir.file("nv") +
                                  "\"\nmax_mapl_count = \"2\"\nmax_mapl_rwlocks_count = \"2\"\n");

    daemonRun(config, [](Shelf &shelf, SaHpiResourceIdT chassis, SaHpiResourceIdT board) {
        // The operating mode and a 12V limit change on the plug-in's side,
        // not through an HPI call, so the daemon keeps no copy of them; an
        // operator then saves the chassis and the board explicitly.
        shelf.setControl(chassis, "Operating mode", discrete(3), false);
        shelf.setThresholds(board, "Board 12V", upperLimits(208, 210), false);
        shelf.explicitly(chassis, true);
        shelf.explicitly(board, true);

        // Clients then change settings through the HPI calls.
        SaHpiTextBufferT tag = text("Rack 7 chassis");
        EXPECT_EQ(saHpiResourceTagSet(clientSession, chassis, &tag), SA_OK);
        EXPECT_EQ(saHpiResourceSeveritySet(clientSession, chassis, SAHPI_MINOR), SA_OK);
        shelf.setThresholds(chassis, "Inlet temperature", upperLimits(36, 42));
        const SaHpiEventStateT upper =
            SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR | SAHPI_ES_UPPER_CRIT;
        shelf.setEnables(chassis, "Inlet temperature",
                         {SAHPI_SENSTAT_EVENTS_ENABLED, upper, upper});
        shelf.setControl(chassis, "Display brightness", analog(30));
    });

    daemonRun(config, [](Shelf &shelf, SaHpiResourceIdT chassis, SaHpiResourceIdT board) {
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

// ---------------------------------------------------------------------------
// The restore on the fake plug-in.

class DaemonRestoreTest : public ParmControlTest
{
  protected:
    // What the HPI calls that changed the settings left in the store.
    void changed(SaHpiResourceIdT Rid, SaHpiBoolT Flag, const char *Tag, SaHpiSeverityT Severity)
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
        SaHpiCtrlStateT state = discrete(Value);
        ASSERT_EQ(kviCsSaveCtrlStateNV(DOM, Rid, Num, Flag, &state), SA_OK);
    }
};

// Only settings changed through the API are put back: a resource never
// touched keeps what its plug-in reported, an explicit save's copy is not
// the daemon's, and an ignored control keeps its state whatever was saved.
TEST_F(DaemonRestoreTest, SettingsNeverChangedAndIgnoredControlsKeepWhatThePlugInReported)
{
    Record s = sensor(), c = control(), ignored = control(SAHPI_CTRL_TYPE_DISCRETE, SAHPI_TRUE);
    c.State->Ctrl.StateUnion.Discrete = 3;
    ignored.State->Ctrl.StateUnion.Discrete = 4;
    SaHpiResourceIdT rid = addResource({&s, &c, &ignored}, "discovered", SAHPI_MINOR);
    changed(rid, SAHPI_FALSE, "explicitly saved", SAHPI_CRITICAL);
    changedSensor(rid, 1, SAHPI_FALSE, 90, 0x1);
    changedControl(rid, 2, SAHPI_FALSE, 99);
    changedControl(rid, 3, SAHPI_TRUE, 8);
    KviLogCapture log;
    ASSERT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_OK);
    EXPECT_EQ(str(entry(rid).ResourceTag), "discovered");
    EXPECT_EQ(entry(rid).ResourceSeverity, SAHPI_MINOR);
    EXPECT_EQ(ignored.State->Ctrl.StateUnion.Discrete, 4u);
    EXPECT_TRUE(calls.empty());
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM, "resource tag was not saved. cannot restore"));
    EXPECT_FALSE(log.contains("kviCsNonVolatileGet failed"));
}

// Every active resource gets the daemon's copy back; within a resource the
// first failure stops it, and the domain walk goes on.
TEST_F(DaemonRestoreTest, AFailingResourceDoesNotStopTheOthers)
{
    Record failing = sensor(), later = sensor(), c = control();
    failing.State->SetResult = SA_ERR_HPI_BUSY;
    c.State->SetResult = SA_ERR_HPI_BUSY;
    SaHpiResourceIdT bad = addResource({&failing, &later});
    SaHpiResourceIdT good = addResource({}, "before");
    SaHpiResourceIdT withControl = addResource({&c});
    changedSensor(bad, 1, SAHPI_TRUE, 10, 0x1);
    changedSensor(bad, 2, SAHPI_TRUE, 20, 0x2);
    changed(good, SAHPI_TRUE, "after", SAHPI_OK);
    changedControl(withControl, 1, SAHPI_TRUE, 5);
    KviLogCapture log;
    ASSERT_EQ(kviCsDaemonRestoreDomain(DOM), SA_OK);
    EXPECT_EQ(str(entry(good).ResourceTag), "after");
    EXPECT_EQ(entry(good).ResourceSeverity, SAHPI_OK);
    EXPECT_EQ(failing.State->CapabilitiesSeen, 0u) << "the thresholds failed first";
    EXPECT_EQ(later.State->Thresholds.UpMajor.Raw, 0u);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_L_NUM,
                 "Calling kviIsParmControlDeamonRestore Dom 0, ResId " + std::to_string(good)));
    EXPECT_EQ(log.matching("kviIsParmControlDeamonRestore returned -1001").size(), 2u);
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreSensorThresh Failed. rc -1001"));
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreCtrlState Failed. rc -1001"));

    // A failing event-enable set is reported too.
    later.State->SetResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(kviCsDeamonRestoreEventEnables(DOM, bad, 2, &later.Rdr, &later.Table, later.State),
              SA_ERR_HPI_ERROR);
    EXPECT_EQ(later.State->CapabilitiesSeen, entry(bad).ResourceCapabilities);
}

// A damaged saved value fails its resource; a domain without active
// resources is an error; null records and tables are refused.
TEST_F(DaemonRestoreTest, DamagedValuesEmptyDomainsAndNullArgumentsAreErrors)
{
    KviLogCapture log;
    EXPECT_EQ(kviCsDaemonRestoreDomain(DOM), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsRptActiveEntryGet returned -1013"));

    SaHpiResourceIdT rid = addResource({}, "discovered");
    SaHpiTextBufferT tag = text("long enough");
    const std::string tagKey = nvKey(KVI_NVKEY_RESOURCE_TAG_PREFIX, 1, rid);
    ASSERT_EQ(kviCsNonVolatilePut(tagKey.c_str(), 12, &tag), SA_OK);
    EXPECT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM, "bytesRead did not match TextBuffer size."));
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreResourceTag failed. rc=-1001"));
    EXPECT_EQ(str(entry(rid).ResourceTag), "discovered");
    ASSERT_EQ(kviCsNonVolatileDelete(tagKey.c_str()), SA_OK);
    ASSERT_EQ(
        kviCsNonVolatilePut(nvKey(KVI_NVKEY_RESOURCE_SEVERITY_PREFIX, 1, rid).c_str(), 1, "x"),
        SA_OK);
    EXPECT_EQ(kviCsParmControlDeamonRestore(DOM, rid), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsDeamonRestoreResourceSeverity failed. rc=-1001"));

    Record s = sensor();
    for (SaErrorT rc : {kviCsDeamonRestoreSensorThresh(DOM, 1, 1, nullptr, &s.Table, s.State),
                        kviCsDeamonRestoreEventEnables(DOM, 1, 1, &s.Rdr, nullptr, s.State),
                        kviCsDeamonRestoreCtrlState(DOM, 1, 1, nullptr, &s.Table, s.State)})
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
}

} // namespace
