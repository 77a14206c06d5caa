// The redirected calls as a client makes them: the simulated shelf walked
// through saHpi* alone, every refusal shape once, the checks of what a client
// may set at their boundaries, the locks a call takes, and the saves that a
// successful set leaves behind.
#include <dlfcn.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstring>
#include <thread>

#include "../../core/SaHpi/rpt/RptTestSupport.h"
#include "../../plugins/simulator/SimulatorTestSupport.h"
#include "core/SaHpi/domain/Domain.h"
#include "core/SaHpi/parmControl/ParmControlHelpers.h"
#include "core/utils/NonVolatileStorage.h"
#include "daemon/apiRedirector/ApiRedirector.h"
#include "plugins/simulator/KviSimulator.h"
#include "support/KviTestSupport.h"

namespace
{

using Clock = std::chrono::steady_clock;

// A resource of the test's own, added beside the shelf: one sensor without
// thresholds whose slots do what the test says.
constexpr SaHpiUint32T kFakeMapl = 99;
std::atomic<SaErrorT> fakeResult{SA_OK};
std::atomic<bool> fakeBlocked{false};
std::atomic<int> fakeCalls{0};

SaErrorT fakeReading(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiSensorNumT, SaHpiEventCategoryT,
                     SaHpiRdrT *, void *, SaHpiSensorReadingT *)
{
    fakeCalls++;
    while (fakeBlocked)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    return fakeResult;
}

class RedirectedCallsTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        dir_ = new KviTempDir;
        const std::string config =
            "mapl_modules = \"" + simulatorPath() + "\"\nKviSimProcessorBoards = \"1\"\n" +
            "KviSimFanTrays = \"1\"\nKviSimFans = \"2\"\nKviSimPowerSupplies = \"1\"\n" +
            "KviNvStorageDir = \"" + dir_->path() + "\"\n";
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_->write("sim.conf", config).c_str()), SA_OK);
        ASSERT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
        SaHpiVersionT version = 0;
        ASSERT_EQ(saHpiInitialize(&version), SA_OK);
        ASSERT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session_, nullptr), SA_OK);
        ASSERT_EQ(saHpiResourcesDiscover(session_), SA_OK);
        ASSERT_EQ(KVI_CS_RW_LOCK_INIT(&fakeLock_), SA_OK);
        addFake();
    }

    // An inactive resource with one sensor, then an active one.
    static void addFake()
    {
        KviDsRdrFnTable fn{};
        fn.SensorReadingGet = fakeReading;
        for (SaHpiBoolT active : {SAHPI_FALSE, SAHPI_TRUE}) {
            SaHpiResourceIdT rid = 0;
            SaHpiRptEntryT entry = makeRptEntry();
            KviDsRptFnTable rptFn{};
            ASSERT_EQ(kviCsRptEntryAdd(0, entry, nullptr, SAHPI_FALSE, &rptFn, kFakeMapl,
                                       &fakeLock_, &rid),
                      SA_OK);
            SaHpiRdrT rdr = makeRdr(SAHPI_SENSOR_RDR);
            SaHpiEntryIdT recordId = 0;
            KviCsRdrRecordNumT number{};
            ASSERT_EQ(kviCsRdrAdd(0, rid, &rdr, nullptr, &fn, &recordId, &number), SA_OK);
            if (active) {
                ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(0, rid, SAHPI_TRUE), SA_OK);
            }
            (active ? fake_ : inactive_) = rid;
        }
    }

    // The first active resource whose tag starts with Prefix.
    static SaHpiRptEntryT resource(const std::string &Prefix)
    {
        SaHpiRptEntryT entry{};
        for (SaHpiEntryIdT at = SAHPI_FIRST_ENTRY; at != SAHPI_LAST_ENTRY;) {
            EXPECT_EQ(saHpiRptEntryGet(session_, at, &at, &entry), SA_OK);
            if (textOf(entry.ResourceTag).rfind(Prefix, 0) == 0)
                return entry;
        }
        ADD_FAILURE() << "no resource " << Prefix;
        return entry;
    }

    // The records of a resource as saHpiRdrGet walks them.
    static std::vector<SaHpiRdrT> records(SaHpiResourceIdT Rid)
    {
        std::vector<SaHpiRdrT> all;
        for (SaHpiEntryIdT at = SAHPI_FIRST_ENTRY; at != SAHPI_LAST_ENTRY;) {
            SaHpiRdrT rdr{};
            if (saHpiRdrGet(session_, Rid, at, &at, &rdr) != SA_OK)
                break;
            all.push_back(rdr);
        }
        return all;
    }

    static SaHpiSessionIdT session_;
    static SaHpiResourceIdT fake_;
    static SaHpiResourceIdT inactive_;
    static KviCsRwLockT fakeLock_;
    static KviTempDir *dir_;
};
SaHpiSessionIdT RedirectedCallsTest::session_ = 0;
SaHpiResourceIdT RedirectedCallsTest::fake_ = 0;
SaHpiResourceIdT RedirectedCallsTest::inactive_ = 0;
KviCsRwLockT RedirectedCallsTest::fakeLock_;
KviTempDir *RedirectedCallsTest::dir_ = nullptr;

// Every record of every resource through the calls that apply to it; what a
// set writes, the next get reads.
TEST_F(RedirectedCallsTest, ClientWalksTheShelfAndEverySetIsSeenByTheNextGet)
{
    int sensors = 0, controls = 0, inventories = 0, watchdogs = 0, logs = 0, powered = 0;
    for (SaHpiEntryIdT at = SAHPI_FIRST_ENTRY; at != SAHPI_LAST_ENTRY;) {
        SaHpiRptEntryT entry{};
        ASSERT_EQ(saHpiRptEntryGet(session_, at, &at, &entry), SA_OK);
        const SaHpiResourceIdT rid = entry.ResourceId;
        if (rid == fake_)
            continue;
        SCOPED_TRACE(textOf(entry.ResourceTag));
        for (SaHpiRdrT &rdr : records(rid)) {
            if (rdr.RdrType == SAHPI_SENSOR_RDR) {
                const SaHpiSensorNumT n = rdr.RdrTypeUnion.SensorRec.Num;
                SaHpiSensorReadingT reading{}, converted{};
                SaHpiSensorTypeT type{};
                SaHpiEventCategoryT category = 0;
                SaHpiSensorEvtEnablesT enables{};
                EXPECT_EQ(saHpiSensorReadingGet(session_, rid, n, &reading), SA_OK);
                EXPECT_EQ(saHpiSensorTypeGet(session_, rid, n, &type, &category), SA_OK);
                EXPECT_EQ(category, rdr.RdrTypeUnion.SensorRec.Category);
                EXPECT_EQ(saHpiSensorEventEnablesGet(session_, rid, n, &enables), SA_OK);
                EXPECT_EQ(saHpiSensorEventEnablesSet(session_, rid, n, &enables), SA_OK);
                if (rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold) {
                    SaHpiSensorThresholdsT th{}, back{};
                    EXPECT_EQ(saHpiSensorThresholdsGet(session_, rid, n, &th), SA_OK);
                    EXPECT_EQ(saHpiSensorThresholdsSet(session_, rid, n, &th), SA_OK);
                    EXPECT_EQ(saHpiSensorThresholdsGet(session_, rid, n, &back), SA_OK);
                    EXPECT_EQ(memcmp(&th, &back, sizeof th), 0);
                    if (reading.ValuesPresent & SAHPI_SRF_RAW) {
                        reading.ValuesPresent = SAHPI_SRF_RAW;
                        EXPECT_EQ(saHpiSensorReadingConvert(session_, rid, n, &reading, &converted),
                                  SA_OK);
                    }
                }
                sensors++;
            } else if (rdr.RdrType == SAHPI_CTRL_RDR) {
                const SaHpiCtrlNumT n = rdr.RdrTypeUnion.CtrlRec.Num;
                SaHpiCtrlTypeT type{};
                SaHpiCtrlStateT state{}, back{};
                EXPECT_EQ(saHpiControlTypeGet(session_, rid, n, &type), SA_OK);
                EXPECT_EQ(type, rdr.RdrTypeUnion.CtrlRec.Type);
                if (type == SAHPI_CTRL_TYPE_TEXT)
                    state.StateUnion.Text.Line = 1;
                EXPECT_EQ(saHpiControlStateGet(session_, rid, n, &state), SA_OK);
                if (type == SAHPI_CTRL_TYPE_TEXT)
                    state.StateUnion.Text.Line = 1;
                EXPECT_EQ(saHpiControlStateSet(session_, rid, n, &state), SA_OK);
                back.StateUnion.Text.Line = state.StateUnion.Text.Line;
                EXPECT_EQ(saHpiControlStateGet(session_, rid, n, &back), SA_OK);
                EXPECT_EQ(back.Type, state.Type);
                controls++;
            } else if (rdr.RdrType == SAHPI_INVENTORY_RDR) {
                alignas(8) static SaHpiUint8T buffer[65536];
                auto *data = reinterpret_cast<SaHpiInventoryDataT *>(buffer);
                SaHpiUint32T size = 0;
                const SaHpiEirIdT n = rdr.RdrTypeUnion.InventoryRec.EirId;
                EXPECT_EQ(saHpiEntityInventoryDataRead(session_, rid, n, 0, data, &size),
                          SA_ERR_HPI_DATA_LEN_INVALID);
                EXPECT_EQ(saHpiEntityInventoryDataRead(session_, rid, n, size, data, &size), SA_OK);
                EXPECT_GT(size, 0u);
                inventories++;
            } else if (rdr.RdrType == SAHPI_WATCHDOG_RDR) {
                const SaHpiWatchdogNumT n = rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
                SaHpiWatchdogT wd{}, back{};
                EXPECT_EQ(saHpiWatchdogTimerGet(session_, rid, n, &wd), SA_OK);
                wd.InitialCount = 60000;
                wd.PreTimeoutInterval = 1000;
                wd.Running = SAHPI_FALSE;
                EXPECT_EQ(saHpiWatchdogTimerSet(session_, rid, n, &wd), SA_OK);
                EXPECT_EQ(saHpiWatchdogTimerGet(session_, rid, n, &back), SA_OK);
                EXPECT_EQ(back.InitialCount, 60000u);
                EXPECT_EQ(saHpiWatchdogTimerReset(session_, rid, n), SA_OK);
                watchdogs++;
            }
        }
        if (entry.ResourceCapabilities & SAHPI_CAPABILITY_SEL) {
            SaHpiSelInfoT info{};
            SaHpiBoolT enable = SAHPI_FALSE;
            SaHpiTimeT time = 0;
            EXPECT_EQ(saHpiEventLogInfoGet(session_, rid, &info), SA_OK);
            EXPECT_EQ(saHpiEventLogStateSet(session_, rid, SAHPI_FALSE), SA_OK);
            EXPECT_EQ(saHpiEventLogStateGet(session_, rid, &enable), SA_OK);
            EXPECT_EQ(enable, SAHPI_FALSE);
            EXPECT_EQ(saHpiEventLogStateSet(session_, rid, SAHPI_TRUE), SA_OK);
            EXPECT_EQ(saHpiEventLogTimeGet(session_, rid, &time), SA_OK);
            EXPECT_EQ(saHpiEventLogTimeSet(session_, rid, time), SA_OK);
            SaHpiSelEntryT added{};
            added.Event.EventType = SAHPI_ET_USER;
            EXPECT_EQ(saHpiEventLogEntryAdd(session_, rid, &added), SA_OK);
            SaHpiSelEntryIdT prev = 0, next = 0;
            SaHpiSelEntryT got{};
            EXPECT_EQ(saHpiEventLogEntryGet(session_, rid, SAHPI_OLDEST_ENTRY, &prev, &next, &got,
                                            nullptr, nullptr),
                      SA_OK);
            EXPECT_EQ(saHpiEventLogEntryDelete(session_, rid, got.EntryId), SA_OK);
            EXPECT_EQ(saHpiEventLogClear(session_, rid), SA_OK);
            EXPECT_EQ(saHpiEventLogEntryGet(session_, rid, SAHPI_OLDEST_ENTRY, &prev, &next, &got,
                                            nullptr, nullptr),
                      SA_ERR_HPI_NOT_PRESENT);
            logs++;
        }
        // Resources without reset or power refuse through their empty slots.
        SaHpiResetActionT reset{};
        SaHpiHsPowerStateT power{};
        const SaErrorT resetRc = saHpiResourceResetStateGet(session_, rid, &reset);
        const SaErrorT powerRc = saHpiResourcePowerStateGet(session_, rid, &power);
        EXPECT_TRUE(resetRc == SA_OK || resetRc == SA_ERR_HPI_INVALID_CMD) << resetRc;
        EXPECT_TRUE(powerRc == SA_OK || powerRc == SA_ERR_HPI_INVALID_CMD) << powerRc;
        if (resetRc == SA_OK) {
            EXPECT_EQ(saHpiResourceResetStateSet(session_, rid, reset), SA_OK);
        }
        if (powerRc == SA_OK) {
            EXPECT_EQ(saHpiResourcePowerStateSet(session_, rid, power), SA_OK);
        }
        powered += powerRc == SA_OK;
        if (entry.ResourceCapabilities & SAHPI_CAPABILITY_CONFIGURATION) {
            EXPECT_EQ(saHpiParmControl(session_, rid, SAHPI_SAVE_PARM), SA_OK);
            EXPECT_EQ(saHpiParmControl(session_, rid, SAHPI_RESTORE_PARM), SA_OK);
        }
    }
    EXPECT_GT(sensors, 0);
    EXPECT_GT(controls, 0);
    EXPECT_GT(inventories, 0);
    EXPECT_GT(watchdogs, 0);
    EXPECT_GT(logs, 0);
    EXPECT_GT(powered, 0);
    // The domain's own log is the first active resource's.
    SaHpiSelInfoT info{};
    EXPECT_EQ(saHpiEventLogInfoGet(session_, SAHPI_DOMAIN_CONTROLLER_ID, &info), SA_OK);
}

TEST_F(RedirectedCallsTest, TablesAnswerTagsSeveritiesAndTheirRefusals)
{
    const SaHpiResourceIdT rid = resource("Chassis").ResourceId;
    SaHpiTextBufferT tag = textBuffer("Renamed");
    ASSERT_EQ(saHpiResourceTagSet(session_, rid, &tag), SA_OK);
    ASSERT_EQ(saHpiResourceSeveritySet(session_, rid, SAHPI_CRITICAL), SA_OK);
    SaHpiRptEntryT entry{};
    ASSERT_EQ(saHpiRptEntryGetByResourceId(session_, rid, &entry), SA_OK);
    EXPECT_EQ(textOf(entry.ResourceTag), "Renamed");
    EXPECT_EQ(entry.ResourceSeverity, SAHPI_CRITICAL);
    SaHpiRptInfoT info{};
    EXPECT_EQ(saHpiRptInfoGet(session_, &info), SA_OK);
    SaHpiResourceIdT self = 0;
    EXPECT_EQ(saHpiResourceIdGet(session_, &self), SA_ERR_HPI_UNKNOWN);
    SaHpiUint32T schema = 0;
    EXPECT_EQ(saHpiEntitySchemaGet(session_, &schema), SA_ERR_HPI_ERROR); // no key configured

    SaHpiSeverityT bad;
    storeRaw(bad, 7);
    EXPECT_EQ(saHpiResourceSeveritySet(session_, rid, bad), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(saHpiRptEntryGetByResourceId(session_, 4000, &entry), SA_ERR_HPI_INVALID_RESOURCE);
    EXPECT_EQ(saHpiRptEntryGetByResourceId(session_, inactive_, &entry),
              SA_ERR_HPI_INVALID_RESOURCE);
    SaHpiEntryIdT next = 0;
    SaHpiRdrT rdr{};
    EXPECT_EQ(saHpiRdrGet(session_, inactive_, SAHPI_FIRST_ENTRY, &next, &rdr),
              SA_ERR_HPI_INVALID_RESOURCE);
    EXPECT_EQ(saHpiRptEntryGet(session_, SAHPI_LAST_ENTRY, &next, &entry),
              SA_ERR_HPI_INVALID_PARAMS);
    tag = textBuffer("Chassis");
    EXPECT_EQ(saHpiResourceTagSet(session_, rid, &tag), SA_OK);
    EXPECT_EQ(saHpiResourceSeveritySet(session_, rid, SAHPI_MAJOR), SA_OK);
}

// One case per shape of refusal; the plug-in is never called for any.
TEST_F(RedirectedCallsTest, RefusalsComeBeforeThePlugin)
{
    const SaHpiResourceIdT board = resource("Chassis").ResourceId;
    SaHpiSensorNumT plain = 0;
    for (const SaHpiRdrT &rdr : records(board))
        if (rdr.RdrType == SAHPI_SENSOR_RDR &&
            !rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold)
            plain = rdr.RdrTypeUnion.SensorRec.Num;
    ASSERT_NE(plain, 0);
    SaHpiSensorReadingT reading{};
    SaHpiSensorThresholdsT th{};
    SaHpiParmActionT action;
    storeRaw(action, 3);
    // What a C caller can pass; made here without loading it as an enum.
    const auto reset = static_cast<SaHpiResetActionT>(4);
    KviLogCapture log(KVI_LOG_DBG_H_NUM);
    const struct {
        const char *what;
        SaErrorT rc;
        SaErrorT expected;
        const char *line;
    } cases[] = {
        {"NULL argument", saHpiSensorReadingGet(session_, fake_, 1, nullptr),
         SA_ERR_HPI_INVALID_PARAMS, "Reading pointer is NULL."},
        {"unknown session", saHpiSensorReadingGet(12345, fake_, 1, &reading),
         SA_ERR_HPI_INVALID_SESSION, "Invalid session 12345"},
        {"unknown resource", saHpiSensorReadingGet(session_, 4000, 1, &reading),
         SA_ERR_HPI_INVALID_RESOURCE, "Failed to retrieve the RDR."},
        {"inactive resource", saHpiSensorReadingGet(session_, inactive_, 1, &reading),
         SA_ERR_HPI_INVALID_RESOURCE, "RPT Entry for this RDR is not active"},
        {"unknown record", saHpiSensorReadingGet(session_, fake_, 9, &reading),
         SA_ERR_HPI_NOT_PRESENT, "Failed to retrieve the RDR."},
        {"record of another type", saHpiWatchdogTimerReset(session_, fake_, 1),
         SA_ERR_HPI_NOT_PRESENT, "Failed to retrieve the RDR."},
        {"no thresholds", saHpiSensorThresholdsGet(session_, board, plain, &th),
         SA_ERR_HPI_INVALID_CMD, "Sensor Does not support thresholds"},
        {"NULL slot", saHpiSensorReadingConvert(session_, fake_, 1, &reading, &reading),
         SA_ERR_HPI_INVALID_CMD, "SensorReadingConvert entry in fnTable for resource"},
        {"NULL event-log slot", saHpiEventLogClear(session_, fake_), SA_ERR_HPI_INVALID_CMD,
         "EventLogClear entry in fnTable for resource"},
        {"no configuration capability", saHpiParmControl(session_, fake_, SAHPI_SAVE_PARM),
         SA_ERR_HPI_INVALID_CMD, "Configuration capability not set."},
        {"action out of its enum", saHpiParmControl(session_, fake_, action),
         SA_ERR_HPI_INVALID_PARAMS, "Invalid value (3) in Action."},
        {"reset out of its enum", saHpiResourceResetStateSet(session_, fake_, reset),
         SA_ERR_HPI_INVALID_PARAMS, "Invalid value (4) in ResetAction."},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.what);
        EXPECT_EQ(c.rc, c.expected);
        EXPECT_TRUE(log.contains(c.line)) << c.line;
    }
    EXPECT_EQ(fakeCalls, 0);

    // A plug-in's failure reaches the client as it is.
    fakeResult = SA_ERR_HPI_ENTITY_NOT_PRESENT;
    EXPECT_EQ(saHpiSensorReadingGet(session_, fake_, 1, &reading), SA_ERR_HPI_ENTITY_NOT_PRESENT);
    EXPECT_TRUE(log.contains("SensorReadingGet failed. rc=-1025"));
    fakeResult = SA_OK;
}

// The plug-in runs under its own lock alone: a writer on it makes a call
// wait and give up, the master lock is free while the plug-in works, and an
// unload (a writer on the plug-in's lock) waits for the call in flight.
TEST_F(RedirectedCallsTest, PluginRunsUnderItsOwnLockAlone)
{
    SaHpiSensorReadingT reading{};
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&fakeLock_, 1000), SA_OK);
    const auto start = Clock::now();
    EXPECT_EQ(saHpiSensorReadingGet(session_, fake_, 1, &reading), SA_ERR_HPI_NO_RESPONSE);
    EXPECT_GE(Clock::now() - start, std::chrono::milliseconds(1000));
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&fakeLock_), SA_OK);

    fakeCalls = 0;
    fakeBlocked = true;
    std::thread client(
        [&] { EXPECT_EQ(saHpiSensorReadingGet(session_, fake_, 1, &reading), SA_OK); });
    while (fakeCalls == 0)
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    KviCsRwLockT *master = nullptr;
    ASSERT_EQ(kviDsMaplManagerGetMaplMasterLock(&master), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(master, 1000), SA_OK) << "loading would wait for the plug-in";
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(master), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&fakeLock_, 100), SA_ERR_HPI_TIMEOUT)
        << "an unload must wait for the call in flight";
    fakeBlocked = false;
    client.join();
    fakeCalls = 0;
}

// A set that the plug-in made is the client's even when the store fails to
// keep it; the saves of a good store survive for the daemon's restore.
TEST_F(RedirectedCallsTest, SetsAreSavedForTheDaemonAndAFailedSaveIsOnlyLogged)
{
    const SaHpiResourceIdT board = resource("Processor").ResourceId;
    SaHpiSensorNumT threshold = 0;
    for (const SaHpiRdrT &rdr : records(board))
        if (rdr.RdrType == SAHPI_SENSOR_RDR && rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold)
            threshold = rdr.RdrTypeUnion.SensorRec.Num;
    SaHpiSensorThresholdsT th{}, saved{};
    ASSERT_EQ(saHpiSensorThresholdsGet(session_, board, threshold, &th), SA_OK);
    ASSERT_EQ(saHpiSensorThresholdsSet(session_, board, threshold, &th), SA_OK);
    EXPECT_EQ(kviCsGetThreshNV(0, board, threshold, SAHPI_TRUE, &saved), SA_OK);

    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    kviCsNvFileOps.writeFile = [](int, const void *, size_t) -> ssize_t {
        errno = ENOSPC;
        return -1;
    };
    EXPECT_EQ(saHpiSensorThresholdsSet(session_, board, threshold, &th), SA_OK);
    EXPECT_EQ(saHpiEventLogStateSet(session_, board, SAHPI_TRUE), SA_OK);
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    EXPECT_TRUE(log.contains("kviIsSaveThreshNV failed. rc="));
    EXPECT_TRUE(log.contains("kviCsSaveEvtLogStNV failed. rc="));
}

// A subscriber gets each event with its source's record and entry when it
// asks; what cannot be appended is marked, and the event still arrives.
TEST_F(RedirectedCallsTest, EventsArriveWithTheirRecordAndEntryAppended)
{
    SaHpiSessionIdT session = 0;
    ASSERT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr), SA_OK);
    SaHpiUint32T initial = 0;
    ASSERT_EQ(kviDsSubscribe(session, SAHPI_FALSE, &initial), SA_OK);
    SaHpiEventT events[3]{};
    events[0].Source = fake_;
    events[0].EventType = SAHPI_ET_SENSOR;
    events[0].EventDataUnion.SensorEvent.SensorNum = 1;
    events[1].Source = fake_;
    events[1].EventType = SAHPI_ET_USER;
    events[2].Source = inactive_;
    events[2].EventType = SAHPI_ET_SENSOR;
    events[2].EventDataUnion.SensorEvent.SensorNum = 1;
    ASSERT_EQ(kviCsPutEvent(0, events, 3, SAHPI_FALSE, 0, nullptr), SA_OK);

    const struct {
        SaHpiRdrTypeT rdrType;
        bool entry;
    } expected[] = {{SAHPI_SENSOR_RDR, true}, {SAHPI_NO_RECORD, true}, {SAHPI_NO_RECORD, false}};
    SaHpiUint32T last = initial;
    for (const auto &e : expected) {
        SaHpiEventT event{};
        SaHpiUint32T number = 0;
        SaHpiRdrT rdr{};
        SaHpiRptEntryT entry{};
        ASSERT_EQ(kviDsEventGet(session, SAHPI_TIMEOUT_IMMEDIATE, &event, &number, &rdr, &entry),
                  SA_OK);
        EXPECT_EQ(number, last + 1);
        last = number;
        EXPECT_EQ(rdr.RdrType, e.rdrType);
        EXPECT_EQ(entry.ResourceCapabilities != 0, e.entry);
    }
    SaHpiEventT event{};
    EXPECT_EQ(saHpiEventGet(session, 1000000, &event, nullptr, nullptr), SA_ERR_HPI_TIMEOUT);
    EXPECT_EQ(kviDsEventGet(session, 0, nullptr, &last, nullptr, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);

    // A reader blocked without end wakes when its session closes.
    std::thread reader([&] {
        SaHpiEventT e{};
        EXPECT_EQ(saHpiEventGet(session, SAHPI_TIMEOUT_BLOCK, &e, nullptr, nullptr),
                  SA_ERR_HPI_INVALID_SESSION);
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
    EXPECT_EQ(saHpiSessionClose(session), SA_OK);
    reader.join();
    EXPECT_EQ(saHpiUnsubscribe(session), SA_ERR_HPI_INVALID_SESSION);
}

// ---- Hot swap on the simulated shelf ----

constexpr SaHpiTimeoutT kSecond = 1000000000LL;
using Change = std::pair<SaHpiHsStateT, SaHpiHsStateT>; // previous, new

template <typename Fn> Fn simulatorHook(const char *Name)
{
    void *handle = dlopen(simulatorPath().c_str(), RTLD_NOW | RTLD_NOLOAD);
    EXPECT_NE(handle, nullptr);
    auto fn = reinterpret_cast<Fn>(dlsym(handle, Name));
    dlclose(handle);
    return fn;
}

class HotSwapTest : public RedirectedCallsTest
{
  protected:
    // The shelf of the suite before, or one of its own when run alone.
    static void SetUpTestSuite()
    {
        if (session_ == 0)
            RedirectedCallsTest::SetUpTestSuite();
    }
    void SetUp() override
    {
        ASSERT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &events_, nullptr), SA_OK);
        ASSERT_EQ(saHpiSubscribe(events_, SAHPI_FALSE), SA_OK);
        ASSERT_NE(drive_, nullptr);
        ASSERT_EQ(advance_(0), SA_OK); // the countdowns move only when the test says
    }
    void TearDown() override { saHpiSessionClose(events_); }

    // The hot-swap changes posted since the last call, of any resource.
    std::vector<Change> changes()
    {
        std::vector<Change> seen;
        SaHpiEventT e{};
        while (saHpiEventGet(events_, SAHPI_TIMEOUT_IMMEDIATE, &e, nullptr, nullptr) == SA_OK)
            if (e.EventType == SAHPI_ET_HOTSWAP)
                seen.emplace_back(e.EventDataUnion.HotSwapEvent.PreviousHotSwapState,
                                  e.EventDataUnion.HotSwapEvent.HotSwapState);
        return seen;
    }
    SaHpiHsStateT state(SaHpiResourceIdT Rid)
    {
        SaHpiHsStateT s{};
        EXPECT_EQ(saHpiHotSwapStateGet(session_, Rid, &s), SA_OK);
        return s;
    }

    SaHpiSessionIdT events_ = 0;
    KviSimHotSwapDriveT drive_ = simulatorHook<KviSimHotSwapDriveT>(KVI_SIM_HOT_SWAP_DRIVE);
    KviSimClockAdvanceT advance_ = simulatorHook<KviSimClockAdvanceT>(KVI_SIM_CLOCK_ADVANCE);
};

// A board pulled and put back, with the policies running on their own, held
// by a client that took control, and decided by the client.
TEST_F(HotSwapTest, BoardGoesAndComesBackThroughEveryState)
{
    const SaHpiRptEntryT board = resource("Processor");
    const SaHpiResourceIdT old = board.ResourceId;
    ASSERT_EQ(state(old), SAHPI_HS_STATE_ACTIVE_HEALTHY);
    ASSERT_EQ(saHpiAutoExtractTimeoutSet(session_, old, kSecond), SA_OK);
    ASSERT_EQ(drive_(&board.ResourceEntity, SAHPI_FALSE), SA_OK);
    ASSERT_EQ(advance_(kSecond - 1), SA_OK);
    EXPECT_EQ(state(old), SAHPI_HS_STATE_EXTRACTION_PENDING);
    ASSERT_EQ(advance_(1), SA_OK);
    SaHpiRptEntryT entry{};
    EXPECT_EQ(saHpiRptEntryGetByResourceId(session_, old, &entry), SA_ERR_HPI_INVALID_RESOURCE);
    EXPECT_EQ(changes(), (std::vector<Change>{
                             {SAHPI_HS_STATE_ACTIVE_HEALTHY, SAHPI_HS_STATE_EXTRACTION_PENDING},
                             {SAHPI_HS_STATE_EXTRACTION_PENDING, SAHPI_HS_STATE_INACTIVE},
                             {SAHPI_HS_STATE_INACTIVE, SAHPI_HS_STATE_NOT_PRESENT}}));

    // Inserted under a client that stops the auto-insert countdown.
    ASSERT_EQ(saHpiAutoInsertTimeoutSet(session_, 2 * kSecond), SA_OK);
    ASSERT_EQ(drive_(&board.ResourceEntity, SAHPI_TRUE), SA_OK);
    const SaHpiResourceIdT rid = resource("Processor").ResourceId;
    EXPECT_NE(rid, old);
    EXPECT_EQ(state(rid), SAHPI_HS_STATE_INSERTION_PENDING);
    EXPECT_EQ(saHpiHotSwapControlRequest(session_, rid), SA_OK);
    ASSERT_EQ(advance_(10 * kSecond), SA_OK);
    EXPECT_EQ(state(rid), SAHPI_HS_STATE_INSERTION_PENDING);
    EXPECT_EQ(saHpiResourceActiveSet(session_, rid), SA_OK);
    SaHpiHsIndicatorStateT led{};
    EXPECT_EQ(saHpiHotSwapIndicatorStateGet(session_, rid, &led), SA_OK);
    EXPECT_EQ(led, SAHPI_HS_INDICATOR_OFF);

    // Extractions the client refuses, then accepts; an insertion at once.
    ASSERT_EQ(saHpiAutoExtractTimeoutSet(session_, rid, SAHPI_TIMEOUT_BLOCK), SA_OK);
    ASSERT_EQ(saHpiHotSwapActionRequest(session_, rid, SAHPI_HS_ACTION_EXTRACTION), SA_OK);
    ASSERT_EQ(advance_(100 * kSecond), SA_OK);
    EXPECT_EQ(saHpiResourceActiveSet(session_, rid), SA_OK);
    ASSERT_EQ(saHpiHotSwapActionRequest(session_, rid, SAHPI_HS_ACTION_EXTRACTION), SA_OK);
    EXPECT_EQ(saHpiResourceInactiveSet(session_, rid), SA_OK);
    EXPECT_EQ(saHpiHotSwapIndicatorStateGet(session_, rid, &led), SA_OK);
    EXPECT_EQ(led, SAHPI_HS_INDICATOR_ON);
    ASSERT_EQ(saHpiAutoInsertTimeoutSet(session_, SAHPI_TIMEOUT_IMMEDIATE), SA_OK);
    ASSERT_EQ(saHpiHotSwapActionRequest(session_, rid, SAHPI_HS_ACTION_INSERTION), SA_OK);
    EXPECT_EQ(state(rid), SAHPI_HS_STATE_ACTIVE_HEALTHY);
    EXPECT_EQ(changes(), (std::vector<Change>{
                             {SAHPI_HS_STATE_NOT_PRESENT, SAHPI_HS_STATE_INSERTION_PENDING},
                             {SAHPI_HS_STATE_INSERTION_PENDING, SAHPI_HS_STATE_ACTIVE_HEALTHY},
                             {SAHPI_HS_STATE_ACTIVE_HEALTHY, SAHPI_HS_STATE_EXTRACTION_PENDING},
                             {SAHPI_HS_STATE_EXTRACTION_PENDING, SAHPI_HS_STATE_ACTIVE_HEALTHY},
                             {SAHPI_HS_STATE_ACTIVE_HEALTHY, SAHPI_HS_STATE_EXTRACTION_PENDING},
                             {SAHPI_HS_STATE_EXTRACTION_PENDING, SAHPI_HS_STATE_INACTIVE},
                             {SAHPI_HS_STATE_INACTIVE, SAHPI_HS_STATE_INSERTION_PENDING},
                             {SAHPI_HS_STATE_INSERTION_PENDING, SAHPI_HS_STATE_ACTIVE_HEALTHY}}));

    // An inactive board leaves as soon as it is pulled.
    ASSERT_EQ(saHpiAutoExtractTimeoutSet(session_, rid, SAHPI_TIMEOUT_IMMEDIATE), SA_OK);
    ASSERT_EQ(drive_(&board.ResourceEntity, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(saHpiRptEntryGetByResourceId(session_, rid, &entry), SA_ERR_HPI_INVALID_RESOURCE);
    EXPECT_EQ(changes().back(), Change(SAHPI_HS_STATE_INACTIVE, SAHPI_HS_STATE_NOT_PRESENT));
    ASSERT_EQ(drive_(&board.ResourceEntity, SAHPI_TRUE), SA_OK);
    ASSERT_EQ(saHpiAutoInsertTimeoutSet(session_, KVI_CS_DEFAULT_AUTO_INSERT_TIMEOUT), SA_OK);
}

// One case per refusal: the capability, the state, the arguments, the slot.
TEST_F(HotSwapTest, RefusalsNameTheirCause)
{
    const SaHpiRptEntryT fan = resource("Fan");
    const SaHpiResourceIdT tray = fan.ResourceId, chassis = resource("Chassis").ResourceId;
    SaHpiRptEntryT bare = makeRptEntry(SAHPI_CAPABILITY_FRU | SAHPI_CAPABILITY_MANAGED_HOTSWAP);
    KviDsRptFnTable none{};
    SaHpiResourceIdT slotless = 0;
    ASSERT_EQ(
        kviCsRptEntryAdd(0, bare, nullptr, SAHPI_TRUE, &none, kFakeMapl, &fakeLock_, &slotless),
        SA_OK);
    SaHpiHsStateT hs{};
    // A two-valued enum holds no other value in C++; a C caller passes one
    // all the same, as these calls through the C signature do.
    using RawSetT = SaErrorT (*)(SaHpiSessionIdT, SaHpiResourceIdT, SaHpiUint32T);
    const auto action = reinterpret_cast<RawSetT>(saHpiHotSwapActionRequest);
    const auto led = reinterpret_cast<RawSetT>(saHpiHotSwapIndicatorStateSet);
    SaHpiTimeoutT timeout = 0;
    const SaHpiEntityPathT nowhere{};
    const struct {
        const char *what;
        SaErrorT rc, expected;
    } cases[] = {
        {"not a FRU", saHpiHotSwapStateGet(session_, chassis, &hs), SA_ERR_HPI_INVALID_CMD},
        {"not managed", saHpiHotSwapControlRequest(session_, fake_), SA_ERR_HPI_INVALID_CMD},
        {"NULL state", saHpiHotSwapStateGet(session_, tray, nullptr), SA_ERR_HPI_INVALID_PARAMS},
        {"NULL timeout", saHpiAutoInsertTimeoutGet(session_, nullptr), SA_ERR_HPI_INVALID_PARAMS},
        {"action out of its enum", action(session_, tray, 2), SA_ERR_HPI_INVALID_PARAMS},
        {"indicator out of its enum", led(session_, tray, 2), SA_ERR_HPI_INVALID_PARAMS},
        {"negative timeout", saHpiAutoExtractTimeoutSet(session_, tray, -2),
         SA_ERR_HPI_INVALID_PARAMS},
        {"negative domain timeout", saHpiAutoInsertTimeoutSet(session_, -2),
         SA_ERR_HPI_INVALID_PARAMS},
        {"NULL slot", saHpiAutoExtractTimeoutGet(session_, slotless, &timeout),
         SA_ERR_HPI_INVALID_CMD},
        {"control while active", saHpiHotSwapControlRequest(session_, tray),
         SA_ERR_HPI_INVALID_REQUEST},
        {"active set while active", saHpiResourceActiveSet(session_, tray),
         SA_ERR_HPI_INVALID_REQUEST},
        {"inactive set while active", saHpiResourceInactiveSet(session_, tray),
         SA_ERR_HPI_INVALID_REQUEST},
        {"insertion while active",
         saHpiHotSwapActionRequest(session_, tray, SAHPI_HS_ACTION_INSERTION),
         SA_ERR_HPI_INVALID_REQUEST},
        {"drive without a path", drive_(nullptr, SAHPI_TRUE), SA_ERR_HPI_INVALID_PARAMS},
        {"drive not boolean", drive_(&fan.ResourceEntity, 2), SA_ERR_HPI_INVALID_PARAMS},
        {"no such place", drive_(&nowhere, SAHPI_FALSE), SA_ERR_HPI_NOT_PRESENT},
        {"place taken", drive_(&fan.ResourceEntity, SAHPI_TRUE), SA_ERR_HPI_INVALID_REQUEST},
        {"clock backwards", advance_(-1), SA_ERR_HPI_INVALID_PARAMS},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.what);
        EXPECT_EQ(c.rc, c.expected);
    }
    EXPECT_EQ(kviCsRptEntryRemoveByRid(0, slotless), SA_OK);
    EXPECT_TRUE(changes().empty());
}

// The domain's auto-insert timeout survives a restart of the daemon.
TEST_F(HotSwapTest, AutoInsertTimeoutIsSavedAndRestoredWithTheDomain)
{
    ASSERT_EQ(saHpiAutoInsertTimeoutSet(session_, 7 * kSecond), SA_OK);
    SaHpiTimeoutT saved = 0;
    EXPECT_EQ(kviCsGetAutoInsertTimeoutNV(0, SAHPI_TRUE, &saved), SA_OK);
    EXPECT_EQ(saved, 7 * kSecond);
    ASSERT_EQ(kviCsAutoInsertTimeoutSet(0, KVI_CS_DEFAULT_AUTO_INSERT_TIMEOUT), SA_OK);
    EXPECT_EQ(kviCsDaemonRestoreDomain(0), SA_OK);
    SaHpiTimeoutT timeout = 0;
    EXPECT_EQ(saHpiAutoInsertTimeoutGet(session_, &timeout), SA_OK);
    EXPECT_EQ(timeout, 7 * kSecond);
    ASSERT_EQ(saHpiAutoInsertTimeoutSet(session_, KVI_CS_DEFAULT_AUTO_INSERT_TIMEOUT), SA_OK);
}

// ---- The checks of what a client may set, at their boundaries ----

SaHpiRdrT controlRecord(SaHpiCtrlTypeT Type)
{
    SaHpiRdrT rdr{};
    rdr.RdrType = SAHPI_CTRL_RDR;
    rdr.RdrTypeUnion.CtrlRec.Type = Type;
    rdr.RdrTypeUnion.CtrlRec.TypeUnion.Analog = {-5, 10, 0};
    return rdr;
}

TEST(ArgumentChecksTest, ControlStatesAreHeldToTheirRecord)
{
    SaHpiRdrT text = controlRecord(SAHPI_CTRL_TYPE_TEXT);
    text.RdrTypeUnion.CtrlRec.TypeUnion.Text = {16, 2, SAHPI_LANG_UNDEF, SAHPI_TL_TYPE_ASCII6, {}};
    const struct {
        const char *what;
        SaHpiRdrT rdr;
        void (*fill)(SaHpiCtrlStateT &);
        SaErrorT expected;
    } cases[] = {
        {"digital auto", controlRecord(SAHPI_CTRL_TYPE_DIGITAL),
         [](SaHpiCtrlStateT &S) { storeRaw(S.StateUnion.Digital, 255); }, SA_OK},
        {"digital 4", controlRecord(SAHPI_CTRL_TYPE_DIGITAL),
         [](SaHpiCtrlStateT &S) { storeRaw(S.StateUnion.Digital, 4); }, SA_ERR_HPI_INVALID_PARAMS},
        {"analog at min", controlRecord(SAHPI_CTRL_TYPE_ANALOG),
         [](SaHpiCtrlStateT &S) { S.StateUnion.Analog = -5; }, SA_OK},
        {"analog at max", controlRecord(SAHPI_CTRL_TYPE_ANALOG),
         [](SaHpiCtrlStateT &S) { S.StateUnion.Analog = 10; }, SA_OK},
        {"analog past max", controlRecord(SAHPI_CTRL_TYPE_ANALOG),
         [](SaHpiCtrlStateT &S) { S.StateUnion.Analog = 11; }, SA_ERR_HPI_DATA_EX_LIMITS},
        {"stream of 4", controlRecord(SAHPI_CTRL_TYPE_STREAM),
         [](SaHpiCtrlStateT &S) { S.StateUnion.Stream.StreamLength = 4; }, SA_OK},
        {"stream of 5", controlRecord(SAHPI_CTRL_TYPE_STREAM),
         [](SaHpiCtrlStateT &S) { S.StateUnion.Stream.StreamLength = 5; },
         SA_ERR_HPI_INVALID_PARAMS},
        {"stream repeat 2", controlRecord(SAHPI_CTRL_TYPE_STREAM),
         [](SaHpiCtrlStateT &S) { S.StateUnion.Stream.Repeat = 2; }, SA_ERR_HPI_INVALID_PARAMS},
        {"text in any language", text,
         [](SaHpiCtrlStateT &S) {
             S.StateUnion.Text = {2, {SAHPI_TL_TYPE_ASCII6, SAHPI_LANG_ZULU, 32, {}}};
         },
         SA_OK},
        {"text language past zulu", text,
         [](SaHpiCtrlStateT &S) {
             S.StateUnion.Text.Text.DataType = SAHPI_TL_TYPE_ASCII6;
             storeRaw(S.StateUnion.Text.Text.Language, 137);
         },
         SA_ERR_HPI_INVALID_PARAMS},
        {"text of another data type", text,
         [](SaHpiCtrlStateT &S) { S.StateUnion.Text.Text.DataType = SAHPI_TL_TYPE_BCDPLUS; },
         SA_ERR_HPI_DATA_EX_LIMITS},
        {"text line past the last", text,
         [](SaHpiCtrlStateT &S) {
             S.StateUnion.Text = {3, {SAHPI_TL_TYPE_ASCII6, SAHPI_LANG_ENGLISH, 1, {}}};
         },
         SA_ERR_HPI_DATA_EX_LIMITS},
        {"text too long", text,
         [](SaHpiCtrlStateT &S) {
             S.StateUnion.Text = {1, {SAHPI_TL_TYPE_ASCII6, SAHPI_LANG_ENGLISH, 33, {}}};
         },
         SA_ERR_HPI_DATA_EX_LIMITS},
        {"type of another control", controlRecord(SAHPI_CTRL_TYPE_ANALOG),
         [](SaHpiCtrlStateT &S) { S.Type = SAHPI_CTRL_TYPE_DIGITAL; }, SA_ERR_HPI_INVALID_DATA},
        {"unknown type", controlRecord(SaHpiCtrlTypeT(7)),
         [](SaHpiCtrlStateT &S) { storeRaw(S.Type, 7); }, SA_ERR_HPI_ERROR},
    };
    for (auto c : cases) {
        SCOPED_TRACE(c.what);
        SaHpiCtrlStateT state{};
        state.Type = c.rdr.RdrTypeUnion.CtrlRec.Type;
        c.fill(state);
        EXPECT_EQ(validateControlState(&c.rdr, &state), c.expected);
    }
    SaHpiRdrT sensor = makeRdr(SAHPI_SENSOR_RDR);
    SaHpiCtrlStateT state{};
    EXPECT_EQ(validateControlState(&sensor, &state), SA_ERR_HPI_ERROR);
    EXPECT_EQ(validateControlState(&sensor, nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

TEST(ArgumentChecksTest, EventEnablesAreHeldToTheSensorsCategory)
{
    const struct {
        SaHpiEventCategoryT category;
        SaHpiSensorEvtEnablesT enables;
        SaErrorT expected;
    } cases[] = {
        {SAHPI_EC_THRESHOLD, {0, 0x3F, 0x3F}, SA_OK},
        {SAHPI_EC_THRESHOLD, {0, 0x40, 0}, SA_ERR_HPI_INVALID_PARAMS},
        {SAHPI_EC_THRESHOLD, {0, 0, 0x40}, SA_ERR_HPI_INVALID_PARAMS},
        {SAHPI_EC_USAGE, {0, 0x08, 0}, SA_ERR_HPI_INVALID_PARAMS},
        {SAHPI_EC_SEVERITY, {0, 0x1FF, 0}, SA_OK},
        {SAHPI_EC_REDUNDANCY, {0, 0x100, 0}, SA_ERR_HPI_INVALID_PARAMS},
        {SAHPI_EC_GENERIC, {SAHPI_SENSTAT_EVENTS_ENABLED, 0x7FFF, 0}, SA_OK},
        {SAHPI_EC_STATE, {0x01, 0, 0}, SA_ERR_HPI_INVALID_PARAMS},
        {0x0C, {0, 0, 0}, SA_ERR_HPI_ERROR},
    };
    for (auto c : cases) {
        SCOPED_TRACE(testing::Message() << "category " << int(c.category));
        EXPECT_EQ(validateEvtEnables(&c.enables, c.category), c.expected);
    }
}

TEST(ArgumentChecksTest, WatchdogFieldsAreHeldToTheirMeaning)
{
    const SaHpiWatchdogT good{SAHPI_TRUE,
                              SAHPI_FALSE,
                              SAHPI_WTU_SMS_OS,
                              SAHPI_WA_RESET,
                              SAHPI_WPI_NMI,
                              1000,
                              SAHPI_WATCHDOG_EXP_OEM,
                              1000,
                              0};
    EXPECT_EQ(validateWatchdog(&good), SA_OK);
    const struct {
        const char *what;
        void (*spoil)(SaHpiWatchdogT &);
    } cases[] = {
        {"log not a boolean", [](SaHpiWatchdogT &W) { W.Log = 2; }},
        {"timer use", [](SaHpiWatchdogT &W) { storeRaw(W.TimerUse, 6); }},
        {"action", [](SaHpiWatchdogT &W) { storeRaw(W.TimerAction, 4); }},
        {"pre-timer interrupt", [](SaHpiWatchdogT &W) { storeRaw(W.PretimerInterrupt, 4); }},
        {"pre-timeout past the count", [](SaHpiWatchdogT &W) { W.PreTimeoutInterval = 1001; }},
        {"undefined expiration flag", [](SaHpiWatchdogT &W) { W.TimerUseExpFlags = 0x01; }},
    };
    for (auto c : cases) {
        SCOPED_TRACE(c.what);
        SaHpiWatchdogT w = good;
        c.spoil(w);
        EXPECT_EQ(validateWatchdog(&w), SA_ERR_HPI_INVALID_DATA);
    }
}

} // namespace
