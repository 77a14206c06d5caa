// The simulator plug-in loaded the way the daemon loads it: listed in
// "mapl_modules", loaded and asked to discover by the plug-in manager, then
// walked through the library's RPT and RDR tables as a client sees them and
// driven through the function tables stored with its entries.
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <cstring>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "KviDaemonCore.h"
#include "SimulatorTestSupport.h"
#include "kvi/KviMaplManager.h"
#include "support/KviTestSupport.h"

namespace
{

// ---- The daemon's path, from a fresh process ----

// The way the daemon runs it: the configuration names the plug-in,
// saHpiInitialize loads it, a client's discovery fills the tables, and
// saHpiFinalize unloads it again, stopping its countdown thread. The exit
// status tells which step failed.
TEST(SimulatorDeathTest, DaemonLoadsDiscoversAndUnloadsTheShelf)
{
    KviTempDir dir;
    const std::string config = dir.write(
        "daemon.conf", "mapl_modules = \"" + simulatorPath() + "\"\n" + "KviNvStorageDir = \"" +
                           dir.file("nv") + "\"\n" + "KviSimProcessorBoards = \"3\"\n");
    auto child = [&] {
        if (kviCsConfigInit(SAHPI_FALSE, config.c_str()) != SA_OK)
            return 10;
        if (kviDsApiRedirectorInitialize() != SA_OK)
            return 11;
        SaHpiVersionT version = 0;
        if (saHpiInitialize(&version) != SA_OK)
            return 12;
        SaHpiSessionIdT session = 0;
        if (saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr) != SA_OK)
            return 13;
        if (saHpiResourcesDiscover(session) != SA_OK || walkShelf().ByTag.size() != 6)
            return 14;
        // A second pass finds the same shelf and adds nothing.
        if (saHpiResourcesDiscover(session) != SA_OK || walkShelf().ByTag.size() != 6)
            return 15;
        Shelf shelf = walkShelf();
        if (shelf.ByTag["Processor board 3"].Records.size() != 6)
            return 16;
        if (saHpiFinalize() != SA_OK)
            return 17;
        SaHpiEntryIdT next = 0;
        SaHpiRptEntryT entry{};
        if (kviCsRptActiveEntryGet(DOMAIN, SAHPI_FIRST_ENTRY, &next, &entry, nullptr) !=
            SA_ERR_HPI_NOT_PRESENT)
            return 18;
        return 0;
    };
    EXPECT_EXIT(exit(child()), testing::ExitedWithCode(0), "");
}

class SimulatorTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        dir_ = new KviTempDir;
        std::string config = "mapl_modules = \"" + simulatorPath() + "\"\n" +
                             "max_mapl_rwlocks_count = \"" + std::to_string(LOCKS) + "\"\n" +
                             "KviSimProcessorBoards = \"2\"\n"
                             "KviSimFanTrays = \"1\"\n"
                             "KviSimFans = \"3\"\n"
                             "KviSimPowerSupplies = \"1\"\n"
                             "KviSimEventLogSize = \"4\"\n"
                             "KviNvStorageDir = \"" + dir_->path() + "\"\n";
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_->write("sim.conf", config).c_str()), SA_OK);
        ASSERT_EQ(kviCsDomainInitialize(), SA_OK);
        ASSERT_EQ(kviCsRdrInitialize(), SA_OK);
        ASSERT_EQ(kviDsMaplManagerInitialize(), SA_OK);
        baselineBlocks_ = kviTestLiveBlocks(); // the store holds what tests saved: not counted
        ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
        load();
    }

    static void load()
    {
        ASSERT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
        ASSERT_EQ(kviDsMaplManagerDiscoverResources(DOMAIN), SA_OK);
        shelf_ = walkShelf();
    }

    const Resource &res(const std::string &Tag)
    {
        auto it = shelf_.ByTag.find(Tag);
        if (it == shelf_.ByTag.end()) {
            ADD_FAILURE() << "no resource " << Tag;
            static Resource none{};
            return none;
        }
        return it->second;
    }

    const Record &rec(const std::string &Tag, const std::string &Id)
    {
        for (const Record &r : res(Tag).Records)
            if (textOf(r.Rdr.IdString) == Id)
                return r;
        ADD_FAILURE() << "no record " << Id << " on " << Tag;
        static Record none{};
        return none;
    }

    SaHpiResourceIdT rid(const std::string &Tag) { return res(Tag).Entry.ResourceId; }

    // Slot calls as the front end makes them.
    SaHpiSensorReadingT reading(const std::string &Tag, const std::string &Id)
    {
        const Record &r = rec(Tag, Id);
        SaHpiSensorReadingT out{};
        EXPECT_EQ(r.Fn.SensorReadingGet(DOMAIN, rid(Tag), r.Rdr.RdrTypeUnion.SensorRec.Num,
                                        r.Rdr.RdrTypeUnion.SensorRec.Category,
                                        const_cast<SaHpiRdrT *>(&r.Rdr), r.UserData, &out),
                  SA_OK);
        return out;
    }

    SaHpiSensorThresholdsT thresholds(const std::string &Tag, const std::string &Id)
    {
        const Record &r = rec(Tag, Id);
        SaHpiSensorThresholdsT out{};
        EXPECT_EQ(r.Fn.SensorThresholdsGet(DOMAIN, rid(Tag), r.Rdr.RdrTypeUnion.SensorRec.Num,
                                           const_cast<SaHpiRdrT *>(&r.Rdr), r.UserData, &out),
                  SA_OK);
        return out;
    }

    SaErrorT setThresholds(const std::string &Tag, const std::string &Id, SaHpiSensorThresholdsT T)
    {
        const Record &r = rec(Tag, Id);
        return r.Fn.SensorThresholdsSet(DOMAIN, rid(Tag), r.Rdr.RdrTypeUnion.SensorRec.Num,
                                        const_cast<SaHpiRdrT *>(&r.Rdr), &T, r.UserData);
    }

    SaErrorT setControl(const std::string &Tag, const std::string &Id, SaHpiCtrlStateT State)
    {
        const Record &r = rec(Tag, Id);
        return r.Fn.ControlStateSet(DOMAIN, rid(Tag), r.Rdr.RdrTypeUnion.CtrlRec.Num, &State,
                                    r.UserData);
    }

    SaHpiCtrlStateT control(const std::string &Tag, const std::string &Id,
                            SaHpiTxtLineNumT Line = SAHPI_TLN_ALL_LINES)
    {
        const Record &r = rec(Tag, Id);
        SaHpiCtrlStateT out{};
        out.Type = r.Rdr.RdrTypeUnion.CtrlRec.Type;
        out.StateUnion.Text.Line = Line;
        EXPECT_EQ(r.Fn.ControlStateGet(DOMAIN, rid(Tag), r.Rdr.RdrTypeUnion.CtrlRec.Num, r.UserData,
                                       &out),
                  SA_OK);
        return out;
    }

    SaErrorT power(const std::string &Tag, SaHpiHsPowerStateT State)
    {
        const Resource &r = res(Tag);
        return r.Fn.ResourcePowerStateSet(DOMAIN, r.Entry.ResourceId, State, r.UserDefined);
    }

    std::vector<SaHpiSelEntryT> logEntries(const std::string &Tag)
    {
        const Resource &r = res(Tag);
        std::vector<SaHpiSelEntryT> out;
        SaHpiSelEntryIdT id = SAHPI_OLDEST_ENTRY;
        while (id != SAHPI_NO_MORE_ENTRIES) {
            SaHpiSelEntryIdT prev = 0, next = 0;
            SaHpiSelEntryT entry{};
            SaErrorT rc = r.Fn.EventLogEntryGet(DOMAIN, r.Entry.ResourceId, id, r.UserDefined,
                                                &prev, &next, &entry, nullptr, nullptr);
            if (rc == SA_ERR_HPI_NOT_PRESENT && id == SAHPI_OLDEST_ENTRY)
                break;
            EXPECT_EQ(rc, SA_OK);
            if (rc != SA_OK)
                break;
            out.push_back(entry);
            id = next;
        }
        return out;
    }

    void clearLog(const std::string &Tag)
    {
        const Resource &r = res(Tag);
        ASSERT_EQ(r.Fn.EventLogClear(DOMAIN, r.Entry.ResourceId, r.UserDefined), SA_OK);
    }

    static KviTempDir *dir_;
    static Shelf shelf_;
    static SaHpiInt32T baselineBlocks_;
};

KviTempDir *SimulatorTest::dir_ = nullptr;
Shelf SimulatorTest::shelf_;
SaHpiInt32T SimulatorTest::baselineBlocks_ = 0;

// ---- The shelf as a client walks it ----

TEST_F(SimulatorTest, ShelfIsSizedByTheSimulatorsOwnKeys)
{
    // A chassis, two boards, one fan tray and one supply: ids 1 to 5, walked
    // by id modulo 5.
    EXPECT_EQ(shelf_.Order, (std::vector<SaHpiResourceIdT>{5, 1, 2, 3, 4}));
    std::vector<std::string> tags;
    for (auto &[tag, r] : shelf_.ByTag)
        tags.push_back(tag);
    EXPECT_EQ(tags, (std::vector<std::string>{"Chassis 1", "Fan tray 1", "Power supply 1",
                                              "Processor board 1", "Processor board 2"}));
    EXPECT_EQ(res("Fan tray 1").Records.size(), 3u + 2u); // one sensor per fan
    SaHpiSelInfoT info{};
    const Resource &psu = res("Power supply 1");
    ASSERT_EQ(psu.Fn.EventLogInfoGet(DOMAIN, psu.Entry.ResourceId, psu.UserDefined, &info), SA_OK);
    EXPECT_EQ(info.Size, 4u);
}

TEST_F(SimulatorTest, EveryResourceCarriesItsRecordsAndOneOfThePluginsLocks)
{
    struct Expect {
        const char *tag;
        SaHpiEntityTypeT entity;
        SaHpiCapabilitiesT extra;
        size_t sensors, controls, inventories, watchdogs;
    };
    const Expect expected[] = {
        {"Chassis 1", SAHPI_ENT_SYSTEM_CHASSIS, 0, 2, 6, 1, 0},
        {"Processor board 1", SAHPI_ENT_PROCESSOR_BOARD, SAHPI_CAPABILITY_WATCHDOG, 3, 1, 1, 1},
        {"Processor board 2", SAHPI_ENT_PROCESSOR_BOARD, SAHPI_CAPABILITY_WATCHDOG, 3, 1, 1, 1},
        {"Fan tray 1", SAHPI_ENT_COOLING_UNIT, 0, 3, 1, 1, 0},
        {"Power supply 1", SAHPI_ENT_POWER_SUPPLY, 0, 3, 1, 1, 0},
    };
    std::vector<KviCsRwLockT *> pluginLocks;
    for (SaHpiUint32T i = 0; i < LOCKS; i++) {
        KviCsRwLockT *lock = nullptr;
        ASSERT_EQ(kviDsMaplManagerUnprotectedGetMaplLock(res("Chassis 1").MaplNum, i, &lock),
                  SA_OK);
        pluginLocks.push_back(lock);
    }
    std::map<KviCsRwLockT *, int> used;
    for (const Expect &e : expected) {
        SCOPED_TRACE(e.tag);
        const Resource &r = res(e.tag);
        const SaHpiCapabilitiesT common = SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_RDR |
                                          SAHPI_CAPABILITY_SENSOR | SAHPI_CAPABILITY_CONTROL |
                                          SAHPI_CAPABILITY_INVENTORY_DATA | SAHPI_CAPABILITY_SEL |
                                          SAHPI_CAPABILITY_CONFIGURATION;
        EXPECT_EQ(r.Entry.ResourceCapabilities & (common | SAHPI_CAPABILITY_WATCHDOG),
                  common | e.extra);
        EXPECT_EQ(r.Entry.ResourceEntity.Entry[0].EntityType, e.entity);
        EXPECT_EQ(r.Entry.EntryId, r.Entry.ResourceId);
        EXPECT_EQ(r.MaplNum, res("Chassis 1").MaplNum);
        EXPECT_NE(std::find(pluginLocks.begin(), pluginLocks.end(), r.Lock), pluginLocks.end());
        used[r.Lock]++;
        size_t counts[5] = {};
        for (const Record &x : r.Records) {
            counts[x.Rdr.RdrType]++;
            EXPECT_EQ(x.Fn.SensorReadingGet, r.Records[0].Fn.SensorReadingGet);
            EXPECT_GT(x.Rdr.IdString.DataLength, 0);
        }
        EXPECT_EQ(counts[SAHPI_SENSOR_RDR], e.sensors);
        EXPECT_EQ(counts[SAHPI_CTRL_RDR], e.controls);
        EXPECT_EQ(counts[SAHPI_INVENTORY_RDR], e.inventories);
        EXPECT_EQ(counts[SAHPI_WATCHDOG_RDR], e.watchdogs);
    }
    EXPECT_EQ(used.size(), LOCKS) << "resources are spread over the plug-in's locks";

    // Every slot of both tables is filled.
    const Resource &board = res("Processor board 1");
    const void *const *rptSlots = reinterpret_cast<const void *const *>(&board.Fn);
    for (size_t i = 0; i < sizeof(KviDsRptFnTable) / sizeof(void *); i++)
        EXPECT_NE(rptSlots[i], nullptr) << "RPT slot " << i + 1;
    const void *const *rdrSlots = reinterpret_cast<const void *const *>(&board.Records[0].Fn);
    for (size_t i = 0; i < sizeof(KviDsRdrFnTable) / sizeof(void *); i++)
        EXPECT_NE(rdrSlots[i], nullptr) << "RDR slot " << i + 1;
}

TEST_F(SimulatorTest, ChassisHasAControlOfEveryTypeAndTheDefaultsAreItsOwn)
{
    std::vector<SaHpiCtrlTypeT> types;
    for (const Record &r : res("Chassis 1").Records)
        if (r.Rdr.RdrType == SAHPI_CTRL_RDR)
            types.push_back(r.Rdr.RdrTypeUnion.CtrlRec.Type);
    std::sort(types.begin(), types.end());
    EXPECT_EQ(types, (std::vector<SaHpiCtrlTypeT>{SAHPI_CTRL_TYPE_DIGITAL, SAHPI_CTRL_TYPE_DISCRETE,
                                                  SAHPI_CTRL_TYPE_ANALOG, SAHPI_CTRL_TYPE_STREAM,
                                                  SAHPI_CTRL_TYPE_TEXT, SAHPI_CTRL_TYPE_OEM}));
    // The default watchdog and inventory of a board are the simulator's.
    SaHpiRdrT rdr{};
    SaHpiBoolT active = SAHPI_FALSE;
    ASSERT_EQ(kviCsRdrGetWatchdog(DOMAIN, rid("Processor board 1"), SAHPI_DEFAULT_WATCHDOG_NUM,
                                  &rdr, &active, nullptr, nullptr, nullptr, nullptr),
              SA_OK);
    EXPECT_EQ(rdr.RdrType, SAHPI_WATCHDOG_RDR);
    ASSERT_EQ(kviCsRdrGetEir(DOMAIN, rid("Fan tray 1"), SAHPI_DEFAULT_INVENTORY_ID, &rdr, &active,
                             nullptr, nullptr, nullptr, nullptr),
              SA_OK);
    EXPECT_EQ(rdr.RdrType, SAHPI_INVENTORY_RDR);
}

// ---- Sensors ----

TEST_F(SimulatorTest, ReadingsConvertThroughTheRecordsFactors)
{
    SaHpiSensorReadingT r = reading("Processor board 1", "Board 3.3V");
    EXPECT_EQ(r.ValuesPresent, SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED | SAHPI_SRF_EVENT_STATE);
    EXPECT_EQ(r.Raw, 165u);
    EXPECT_EQ(r.Interpreted.Type, SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32);
    EXPECT_NEAR(r.Interpreted.Value.SensorFloat32, 3.30, 1e-4);
    EXPECT_EQ(r.EventStatus.EventStatus, 0);
    const SaHpiSensorFactorsT &f =
        rec("Processor board 1", "Board 3.3V").Rdr.RdrTypeUnion.SensorRec.DataFormat.Factors;
    EXPECT_EQ(f.M_Factor, 2);
    EXPECT_EQ(f.ExpR, -2);

    const Record &v12 = rec("Processor board 1", "Board 12V");
    auto convert = [&](SaHpiSensorReadingT In, SaHpiSensorReadingT *Out) {
        return v12.Fn.SensorReadingConvert(
            DOMAIN, rid("Processor board 1"), v12.Rdr.RdrTypeUnion.SensorRec.Num,
            const_cast<SaHpiRdrT *>(&v12.Rdr), &In, v12.UserData, Out);
    };
    SaHpiSensorReadingT in{}, out{};
    in.ValuesPresent = SAHPI_SRF_RAW;
    in.Raw = 200;
    ASSERT_EQ(convert(in, &out), SA_OK);
    EXPECT_EQ(out.ValuesPresent, SAHPI_SRF_INTERPRETED);
    EXPECT_NEAR(out.Interpreted.Value.SensorFloat32, 12.0, 1e-4);

    in = {};
    in.ValuesPresent = SAHPI_SRF_INTERPRETED;
    in.Interpreted.Type = SAHPI_SENSOR_INTERPRETED_TYPE_INT32;
    in.Interpreted.Value.SensorInt32 = 12;
    ASSERT_EQ(convert(in, &out), SA_OK);
    EXPECT_EQ(out.ValuesPresent, SAHPI_SRF_RAW);
    EXPECT_EQ(out.Raw, 200u);

    struct Bad {
        SaHpiSensorReadingFormatsT present;
        SaHpiUint32T raw;
        SaErrorT rc;
    };
    for (Bad b : {Bad{0, 0, SA_ERR_HPI_INVALID_PARAMS},
                  Bad{SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED, 1, SA_ERR_HPI_INVALID_PARAMS},
                  Bad{SAHPI_SRF_RAW, 256, SA_ERR_HPI_INVALID_DATA}}) {
        in = {};
        in.ValuesPresent = b.present;
        in.Raw = b.raw;
        EXPECT_EQ(convert(in, &out), b.rc) << int(b.present) << " " << b.raw;
    }
    in = {};
    in.ValuesPresent = SAHPI_SRF_INTERPRETED;
    in.Interpreted.Type = SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32;
    in.Interpreted.Value.SensorFloat32 = -5.0f;
    EXPECT_EQ(convert(in, &out), SA_ERR_HPI_INVALID_DATA) << "below raw 0";

    const Record &status = rec("Power supply 1", "Supply status");
    in = {};
    in.ValuesPresent = SAHPI_SRF_RAW;
    EXPECT_EQ(status.Fn.SensorReadingConvert(DOMAIN, rid("Power supply 1"), 0,
                                             const_cast<SaHpiRdrT *>(&status.Rdr), &in,
                                             status.UserData, &out),
              SA_ERR_HPI_INVALID_CMD);
    EXPECT_EQ(v12.Fn.SensorReadingGet(DOMAIN, 1, 1, 1, nullptr, v12.UserData, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
}

TEST_F(SimulatorTest, ReadingsFollowPowerResetAndControls)
{
    const std::string board = "Processor board 2";
    ASSERT_EQ(power(board, SAHPI_HS_POWER_OFF), SA_OK);
    SaHpiHsPowerStateT state = SAHPI_HS_POWER_ON;
    const Resource &b = res(board);
    ASSERT_EQ(b.Fn.ResourcePowerStateGet(DOMAIN, rid(board), b.UserDefined, &state), SA_OK);
    EXPECT_EQ(state, SAHPI_HS_POWER_OFF);
    EXPECT_EQ(reading(board, "Board 3.3V").Raw, 0u);
    EXPECT_EQ(reading(board, "Board 3.3V").EventStatus.EventStatus,
              SAHPI_ES_LOWER_MINOR | SAHPI_ES_LOWER_MAJOR | SAHPI_ES_LOWER_CRIT);
    EXPECT_EQ(reading(board, "CPU temperature").Raw, 25u);
    ASSERT_EQ(power(board, SAHPI_HS_POWER_CYCLE), SA_OK);
    EXPECT_EQ(reading(board, "Board 3.3V").Raw, 165u);
    EXPECT_EQ(reading(board, "Board 3.3V").EventStatus.EventStatus, 0);
    EXPECT_EQ(power(board, static_cast<SaHpiHsPowerStateT>(3)), SA_ERR_HPI_INVALID_PARAMS);

    SaHpiResetActionT reset = SAHPI_COLD_RESET;
    ASSERT_EQ(b.Fn.ResourceResetStateGet(DOMAIN, rid(board), b.UserDefined, &reset), SA_OK);
    EXPECT_EQ(reset, SAHPI_RESET_DEASSERT);
    ASSERT_EQ(b.Fn.ResourceResetStateSet(DOMAIN, rid(board), SAHPI_RESET_ASSERT, b.UserDefined),
              SA_OK);
    ASSERT_EQ(b.Fn.ResourceResetStateGet(DOMAIN, rid(board), b.UserDefined, &reset), SA_OK);
    EXPECT_EQ(reset, SAHPI_RESET_ASSERT);
    EXPECT_EQ(reading(board, "Board 12V").Raw, 0u) << "held in reset";
    EXPECT_EQ(b.Fn.ResourceResetStateSet(DOMAIN, rid(board), SAHPI_WARM_RESET, b.UserDefined),
              SA_ERR_HPI_INVALID_REQUEST);
    ASSERT_EQ(b.Fn.ResourceResetStateSet(DOMAIN, rid(board), SAHPI_RESET_DEASSERT, b.UserDefined),
              SA_OK);
    EXPECT_EQ(b.Fn.ResourceResetStateSet(DOMAIN, rid(board), SAHPI_WARM_RESET, b.UserDefined),
              SA_OK);
    EXPECT_EQ(b.Fn.ResourceResetStateSet(DOMAIN, rid(board), static_cast<SaHpiResetActionT>(9),
                                         b.UserDefined),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(b.Fn.ResourceResetStateGet(DOMAIN, rid(board), b.UserDefined, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);

    // The fan-speed control drives every fan of the tray.
    SaHpiCtrlStateT fan{};
    fan.Type = SAHPI_CTRL_TYPE_ANALOG;
    fan.StateUnion.Analog = 20;
    ASSERT_EQ(setControl("Fan tray 1", "Fan speed", fan), SA_OK);
    for (const char *id : {"Fan 1 speed", "Fan 2 speed", "Fan 3 speed"}) {
        SaHpiSensorReadingT r = reading("Fan tray 1", id);
        EXPECT_EQ(r.Raw, 32u) << id;
        EXPECT_NEAR(r.Interpreted.Value.SensorFloat32, 1600.0, 1e-3) << id;
        EXPECT_EQ(r.EventStatus.EventStatus, SAHPI_ES_LOWER_MINOR) << id;
    }
    fan.StateUnion.Analog = 60;
    ASSERT_EQ(setControl("Fan tray 1", "Fan speed", fan), SA_OK);
    EXPECT_EQ(reading("Fan tray 1", "Fan 2 speed").Raw, 96u);
    EXPECT_EQ(reading("Fan tray 1", "Fan 2 speed").EventStatus.EventStatus, 0);

    // Inhibiting the supply turns its output off.
    SaHpiCtrlStateT inhibit{};
    inhibit.Type = SAHPI_CTRL_TYPE_DIGITAL;
    inhibit.StateUnion.Digital = SAHPI_CTRL_STATE_ON;
    ASSERT_EQ(setControl("Power supply 1", "Power inhibit", inhibit), SA_OK);
    EXPECT_EQ(reading("Power supply 1", "Output 12V").Raw, 0u);
    EXPECT_EQ(reading("Power supply 1", "Supply status").EventStatus.EventStatus,
              SAHPI_ES_POWER_OFF);
    EXPECT_EQ(reading("Power supply 1", "Supply status").ValuesPresent, SAHPI_SRF_EVENT_STATE);
    inhibit.StateUnion.Digital = SAHPI_CTRL_STATE_OFF;
    ASSERT_EQ(setControl("Power supply 1", "Power inhibit", inhibit), SA_OK);
    EXPECT_EQ(reading("Power supply 1", "Supply status").EventStatus.EventStatus, SAHPI_ES_RUNNING);
}

TEST_F(SimulatorTest, ThresholdsAreReadWrittenAndKeptInOrder)
{
    const std::string board = "Processor board 1";
    const SaHpiSensorThresholdsT initial = thresholds(board, "Board 3.3V");
    EXPECT_EQ(initial.LowCritical.Raw, 149u);
    EXPECT_NEAR(initial.LowCritical.Interpreted.Value.SensorFloat32, 2.98, 1e-4);
    EXPECT_EQ(initial.UpMinor.ValuesPresent, SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED);
    EXPECT_EQ(initial.PosThdHysteresis.Raw, 1u);
    const SaHpiSensorThresholdsT cpu = thresholds(board, "CPU temperature");
    EXPECT_EQ(cpu.LowMinor.ValuesPresent, 0) << "the CPU has no low limits";
    EXPECT_EQ(cpu.UpCritical.Raw, 90u);

    // Written as an interpreted value, seen by the next get and the next reading.
    SaHpiSensorThresholdsT t{};
    t.UpMinor.ValuesPresent = SAHPI_SRF_INTERPRETED;
    t.UpMinor.Interpreted.Type = SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32;
    t.UpMinor.Interpreted.Value.SensorFloat32 = 3.2f;
    ASSERT_EQ(setThresholds(board, "Board 3.3V", t), SA_OK);
    EXPECT_EQ(thresholds(board, "Board 3.3V").UpMinor.Raw, 160u);
    EXPECT_EQ(thresholds(board, "Board 3.3V").LowMinor.Raw, 157u) << "untouched";
    EXPECT_EQ(reading(board, "Board 3.3V").EventStatus.EventStatus, SAHPI_ES_UPPER_MINOR);

    // Writing back what was read is fine even for the fixed limits.
    ASSERT_EQ(setThresholds(board, "Board 3.3V", initial), SA_OK);
    EXPECT_EQ(reading(board, "Board 3.3V").EventStatus.EventStatus, 0);

    struct Case {
        const char *what;
        SaHpiSensorReadingT SaHpiSensorThresholdsT::*field;
        SaHpiUint32T raw;
        SaErrorT rc;
    };
    const Case cases[] = {
        {"a fixed limit moved", &SaHpiSensorThresholdsT::UpCritical, 200, SA_ERR_HPI_INVALID_CMD},
        {"low minor above up minor", &SaHpiSensorThresholdsT::LowMinor, 173,
         SA_ERR_HPI_INVALID_DATA},
        {"up major below up minor", &SaHpiSensorThresholdsT::UpMajor, 170, SA_ERR_HPI_INVALID_DATA},
        {"raw out of range", &SaHpiSensorThresholdsT::UpMajor, 300, SA_ERR_HPI_INVALID_DATA},
    };
    for (const Case &c : cases) {
        SaHpiSensorThresholdsT bad{};
        (bad.*c.field).ValuesPresent = SAHPI_SRF_RAW;
        (bad.*c.field).Raw = c.raw;
        EXPECT_EQ(setThresholds(board, "Board 3.3V", bad), c.rc) << c.what;
    }
    SaHpiSensorThresholdsT eventOnly{};
    eventOnly.LowMinor.ValuesPresent = SAHPI_SRF_EVENT_STATE;
    EXPECT_EQ(setThresholds(board, "Board 3.3V", eventOnly), SA_ERR_HPI_INVALID_PARAMS);
    const SaHpiSensorThresholdsT after = thresholds(board, "Board 3.3V");
    EXPECT_EQ(memcmp(&after, &initial, sizeof(initial)), 0) << "a refused set changes nothing";
    EXPECT_EQ(setThresholds("Chassis 1", "Chassis intrusion", t), SA_ERR_HPI_INVALID_CMD);
}

TEST_F(SimulatorTest, EventEnablesAreKeptPerSensor)
{
    const Record &r = rec("Processor board 1", "CPU temperature");
    const SaHpiResourceIdT id = rid("Processor board 1");
    const SaHpiSensorNumT num = r.Rdr.RdrTypeUnion.SensorRec.Num;
    auto get = [&] {
        SaHpiSensorEvtEnablesT e{};
        EXPECT_EQ(
            r.Fn.SensorEventEnablesGet(DOMAIN, id, num, r.UserData, 0, SAHPI_EC_THRESHOLD, &e),
            SA_OK);
        return e;
    };
    auto set = [&](SaHpiSensorEvtEnablesT e) {
        return r.Fn.SensorEventEnablesSet(DOMAIN, id, num, &e, const_cast<SaHpiRdrT *>(&r.Rdr), 0,
                                          r.UserData);
    };
    const SaHpiSensorEvtEnablesT initial = get();
    EXPECT_EQ(initial.SensorStatus, SAHPI_SENSTAT_EVENTS_ENABLED | SAHPI_SENSTAT_SCAN_ENABLED);
    EXPECT_EQ(initial.AssertEvents,
              SAHPI_ES_UPPER_MINOR | SAHPI_ES_UPPER_MAJOR | SAHPI_ES_UPPER_CRIT);

    SaHpiSensorEvtEnablesT e{SAHPI_SENSTAT_SCAN_ENABLED, SAHPI_ES_UPPER_CRIT, 0};
    ASSERT_EQ(set(e), SA_OK);
    SaHpiSensorEvtEnablesT now = get();
    EXPECT_EQ(now.SensorStatus, SAHPI_SENSTAT_SCAN_ENABLED);
    EXPECT_EQ(now.AssertEvents, SAHPI_ES_UPPER_CRIT);
    EXPECT_EQ(now.DeassertEvents, 0);

    EXPECT_EQ(set({SAHPI_SENSTAT_EVENTS_ENABLED, SAHPI_ES_LOWER_MINOR, 0}), SA_ERR_HPI_INVALID_DATA)
        << "the CPU never reports low states";
    EXPECT_EQ(set({0x01, 0, 0}), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(set(initial), SA_OK);
    EXPECT_EQ(get().AssertEvents, initial.AssertEvents);
}

TEST_F(SimulatorTest, SensorStateChangesAreLoggedAndActiveAlarmsTranslated)
{
    const std::string board = "Processor board 1";
    clearLog(board);
    const Record &r = rec(board, "Board 12V");
    const SaHpiSensorNumT num = r.Rdr.RdrTypeUnion.SensorRec.Num;
    SaHpiEventT alarm{};
    EXPECT_EQ(r.Fn.ActiveAlarmTranslate(DOMAIN, rid(board), num, r.UserData,
                                        const_cast<SaHpiRdrT *>(&r.Rdr), nullptr, &alarm),
              SA_ERR_HPI_NOT_PRESENT)
        << "a quiet sensor is no alarm";

    const SaHpiSensorThresholdsT initial = thresholds(board, "Board 12V");
    SaHpiSensorThresholdsT t{};
    t.UpMinor.ValuesPresent = SAHPI_SRF_RAW;
    t.UpMinor.Raw = 195;
    ASSERT_EQ(setThresholds(board, "Board 12V", t), SA_OK);

    ASSERT_EQ(r.Fn.ActiveAlarmTranslate(DOMAIN, rid(board), num, r.UserData,
                                        const_cast<SaHpiRdrT *>(&r.Rdr), nullptr, &alarm),
              SA_OK);
    EXPECT_EQ(alarm.Source, rid(board));
    EXPECT_EQ(alarm.EventType, SAHPI_ET_SENSOR);
    EXPECT_EQ(alarm.Severity, SAHPI_MINOR);
    EXPECT_EQ(alarm.EventDataUnion.SensorEvent.SensorNum, num);
    EXPECT_EQ(alarm.EventDataUnion.SensorEvent.EventState, SAHPI_ES_UPPER_MINOR);
    EXPECT_TRUE(alarm.EventDataUnion.SensorEvent.Assertion);

    ASSERT_EQ(setThresholds(board, "Board 12V", initial), SA_OK);
    std::vector<SaHpiSelEntryT> log = logEntries(board);
    ASSERT_EQ(log.size(), 2u);
    for (size_t i = 0; i < 2; i++) {
        const SaHpiSensorEventT &e = log[i].Event.EventDataUnion.SensorEvent;
        EXPECT_EQ(log[i].Event.EventType, SAHPI_ET_SENSOR);
        EXPECT_EQ(e.SensorNum, num);
        EXPECT_EQ(e.EventState, SAHPI_ES_UPPER_MINOR);
        EXPECT_EQ(e.Assertion, i == 0 ? SAHPI_TRUE : SAHPI_FALSE);
        EXPECT_EQ(e.TriggerReading.Raw, 200u);
        EXPECT_EQ(e.TriggerThreshold.Raw, i == 0 ? 195u : 207u);
    }
    EXPECT_LT(log[0].EntryId, log[1].EntryId);

    // The entry names its sensor's record and its resource.
    const Resource &b = res(board);
    SaHpiSelEntryIdT prev = 0, next = 0;
    SaHpiSelEntryT entry{};
    SaHpiRdrT rdr{};
    SaHpiRptEntryT rpt{};
    ASSERT_EQ(b.Fn.EventLogEntryGet(DOMAIN, rid(board), SAHPI_NEWEST_ENTRY, b.UserDefined, &prev,
                                    &next, &entry, &rdr, &rpt),
              SA_OK);
    EXPECT_EQ(rdr.RdrType, SAHPI_SENSOR_RDR);
    EXPECT_EQ(textOf(rdr.IdString), "Board 12V");
    EXPECT_EQ(rpt.ResourceId, rid(board));
    EXPECT_EQ(prev, log[0].EntryId);
    EXPECT_EQ(next, SAHPI_NO_MORE_ENTRIES);

    // Disabled events are not logged.
    const SaHpiSensorEvtEnablesT off{SAHPI_SENSTAT_SCAN_ENABLED, 0x3F, 0x3F};
    SaHpiSensorEvtEnablesT e = off;
    ASSERT_EQ(r.Fn.SensorEventEnablesSet(DOMAIN, rid(board), num, &e,
                                         const_cast<SaHpiRdrT *>(&r.Rdr), 0, r.UserData),
              SA_OK);
    ASSERT_EQ(setThresholds(board, "Board 12V", t), SA_OK);
    ASSERT_EQ(setThresholds(board, "Board 12V", initial), SA_OK);
    EXPECT_EQ(logEntries(board).size(), 2u);
    e = {SAHPI_SENSTAT_EVENTS_ENABLED | SAHPI_SENSTAT_SCAN_ENABLED, 0x3F, 0x3F};
    ASSERT_EQ(r.Fn.SensorEventEnablesSet(DOMAIN, rid(board), num, &e,
                                         const_cast<SaHpiRdrT *>(&r.Rdr), 0, r.UserData),
              SA_OK);
}

// ---- Controls ----

TEST_F(SimulatorTest, ControlsOfEveryTypeKeepWhatIsSet)
{
    const std::string chassis = "Chassis 1";
    SaHpiCtrlStateT s{};

    s.Type = SAHPI_CTRL_TYPE_DIGITAL;
    EXPECT_EQ(control(chassis, "Alarm LED").StateUnion.Digital, SAHPI_CTRL_STATE_OFF);
    s.StateUnion.Digital = SAHPI_CTRL_STATE_PULSE_OFF;
    EXPECT_EQ(setControl(chassis, "Alarm LED", s), SA_ERR_HPI_INVALID_REQUEST) << "not on";
    s.StateUnion.Digital = SAHPI_CTRL_STATE_PULSE_ON;
    EXPECT_EQ(setControl(chassis, "Alarm LED", s), SA_OK);
    EXPECT_EQ(control(chassis, "Alarm LED").StateUnion.Digital, SAHPI_CTRL_STATE_OFF)
        << "a pulse ends where it began";
    s.StateUnion.Digital = SAHPI_CTRL_STATE_ON;
    ASSERT_EQ(setControl(chassis, "Alarm LED", s), SA_OK);
    EXPECT_EQ(control(chassis, "Alarm LED").StateUnion.Digital, SAHPI_CTRL_STATE_ON);
    s.StateUnion.Digital = static_cast<SaHpiCtrlStateDigitalT>(4);
    EXPECT_EQ(setControl(chassis, "Alarm LED", s), SA_ERR_HPI_INVALID_PARAMS);

    s = {};
    s.Type = SAHPI_CTRL_TYPE_DISCRETE;
    s.StateUnion.Discrete = 7;
    ASSERT_EQ(setControl(chassis, "Operating mode", s), SA_OK);
    EXPECT_EQ(control(chassis, "Operating mode").StateUnion.Discrete, 7u);

    s = {};
    s.Type = SAHPI_CTRL_TYPE_ANALOG;
    s.StateUnion.Analog = 100;
    ASSERT_EQ(setControl(chassis, "Display brightness", s), SA_OK);
    EXPECT_EQ(control(chassis, "Display brightness").StateUnion.Analog, 100);
    s.StateUnion.Analog = 101;
    EXPECT_EQ(setControl(chassis, "Display brightness", s), SA_ERR_HPI_DATA_EX_LIMITS);

    s = {};
    s.Type = SAHPI_CTRL_TYPE_STREAM;
    s.StateUnion.Stream = {SAHPI_TRUE, 4, {9, 8, 7, 6}};
    ASSERT_EQ(setControl(chassis, "Buzzer pattern", s), SA_OK);
    SaHpiCtrlStateStreamT stream = control(chassis, "Buzzer pattern").StateUnion.Stream;
    EXPECT_TRUE(stream.Repeat);
    EXPECT_EQ(stream.StreamLength, 4u);
    EXPECT_EQ(stream.Stream[3], 6);
    s.StateUnion.Stream.StreamLength = 5;
    EXPECT_EQ(setControl(chassis, "Buzzer pattern", s), SA_ERR_HPI_INVALID_PARAMS);

    s = {};
    s.Type = SAHPI_CTRL_TYPE_OEM;
    s.StateUnion.Oem.MId = 42;
    s.StateUnion.Oem.BodyLength = 2;
    s.StateUnion.Oem.Body[1] = 0x77;
    ASSERT_EQ(setControl(chassis, "OEM settings", s), SA_OK);
    SaHpiCtrlStateOemT oem = control(chassis, "OEM settings").StateUnion.Oem;
    EXPECT_EQ(oem.MId, 42u);
    EXPECT_EQ(oem.BodyLength, 2);
    EXPECT_EQ(oem.Body[1], 0x77);

    s.Type = SAHPI_CTRL_TYPE_ANALOG;
    EXPECT_EQ(setControl(chassis, "OEM settings", s), SA_ERR_HPI_INVALID_DATA) << "type mismatch";
}

TEST_F(SimulatorTest, TextControlIsADisplayOfLines)
{
    const std::string chassis = "Chassis 1";
    const std::string panel = "Front panel display";
    EXPECT_EQ(textOf(control(chassis, panel).StateUnion.Text.Text), "Kvi simulator   shelf ready");
    EXPECT_EQ(textOf(control(chassis, panel, 2).StateUnion.Text.Text), "shelf ready");

    SaHpiCtrlStateT s{};
    s.Type = SAHPI_CTRL_TYPE_TEXT;
    s.StateUnion.Text.Line = 2;
    s.StateUnion.Text.Text = textBuffer("fan fault");
    ASSERT_EQ(setControl(chassis, panel, s), SA_OK);
    EXPECT_EQ(textOf(control(chassis, panel, 1).StateUnion.Text.Text), "Kvi simulator   ");
    EXPECT_EQ(textOf(control(chassis, panel, 2).StateUnion.Text.Text), "fan fault");
    EXPECT_EQ(textOf(control(chassis, panel).StateUnion.Text.Text), "Kvi simulator   fan fault");

    // A long text written from line 1 wraps onto line 2; all lines at once
    // clears what it does not cover.
    s.StateUnion.Text.Line = 1;
    s.StateUnion.Text.Text = textBuffer("0123456789abcdefXY");
    ASSERT_EQ(setControl(chassis, panel, s), SA_OK);
    EXPECT_EQ(textOf(control(chassis, panel, 2).StateUnion.Text.Text), "XY");
    s.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
    s.StateUnion.Text.Text = textBuffer("ok");
    ASSERT_EQ(setControl(chassis, panel, s), SA_OK);
    EXPECT_EQ(textOf(control(chassis, panel).StateUnion.Text.Text), "ok");
    EXPECT_EQ(control(chassis, panel, 2).StateUnion.Text.Text.DataLength, 0);

    struct Bad {
        const char *what;
        SaHpiTxtLineNumT line;
        SaHpiLanguageT language;
        size_t length;
        SaErrorT rc;
    };
    for (const Bad &b :
         {Bad{"line 3", 3, SAHPI_LANG_ENGLISH, 2, SA_ERR_HPI_DATA_EX_LIMITS},
          Bad{"French", 1, SAHPI_LANG_FRENCH, 2, SA_ERR_HPI_DATA_EX_LIMITS},
          Bad{"no such language", 1, static_cast<SaHpiLanguageT>(137), 2,
              SA_ERR_HPI_INVALID_PARAMS},
          Bad{"longer than the display", 0, SAHPI_LANG_ENGLISH, 33, SA_ERR_HPI_DATA_EX_LIMITS}}) {
        s.StateUnion.Text.Line = b.line;
        s.StateUnion.Text.Text = textBuffer(std::string(b.length, 'x'));
        s.StateUnion.Text.Text.Language = b.language;
        EXPECT_EQ(setControl(chassis, panel, s), b.rc) << b.what;
    }
    EXPECT_EQ(textOf(control(chassis, panel).StateUnion.Text.Text), "ok");
}

// ---- Inventory ----

// The one-element tail arrays of the inventory types run on past their
// declared end; reach them through their byte address.
template <typename T> T *tailOf(void *Object, size_t Offset)
{
    return reinterpret_cast<T *>(static_cast<char *>(Object) + Offset);
}

SaHpiInventDataRecordT **recordList(SaHpiInventoryDataT *Data)
{
    return tailOf<SaHpiInventDataRecordT *>(Data, offsetof(SaHpiInventoryDataT, DataRecords));
}

SaHpiTextBufferT **customList(const SaHpiInventGeneralDataT *General)
{
    return tailOf<SaHpiTextBufferT *>(const_cast<SaHpiInventGeneralDataT *>(General),
                                      offsetof(SaHpiInventGeneralDataT, CustomField));
}

std::vector<SaHpiInventDataRecordT *> recordsOf(SaHpiInventoryDataT *Data)
{
    std::vector<SaHpiInventDataRecordT *> out;
    for (SaHpiInventDataRecordT **r = recordList(Data); *r != nullptr; r++)
        out.push_back(*r);
    return out;
}

TEST_F(SimulatorTest, InventoryIsLaidOutInTheCallersBuffer)
{
    const Record &inv = rec("Chassis 1", "Inventory");
    const SaHpiResourceIdT id = rid("Chassis 1");
    auto read = [&](std::vector<uint64_t> &Buffer, SaHpiUint32T *Actual) {
        return inv.Fn.EntityInventoryDataRead(
            DOMAIN, id, inv.Rdr.RdrTypeUnion.InventoryRec.EirId,
            static_cast<SaHpiUint32T>(Buffer.size() * sizeof(uint64_t)), inv.UserData,
            reinterpret_cast<SaHpiInventoryDataT *>(Buffer.data()), Actual);
    };
    std::vector<uint64_t> small(2);
    SaHpiUint32T actual = 0;
    ASSERT_EQ(read(small, &actual), SA_ERR_HPI_DATA_LEN_INVALID);
    EXPECT_GT(actual, sizeof(SaHpiInventoryDataT));
    EXPECT_EQ(reinterpret_cast<SaHpiInventoryDataT *>(small.data())->Validity,
              SAHPI_INVENT_DATA_OVERFLOW);

    std::vector<uint64_t> buffer((actual + 7) / 8);
    ASSERT_EQ(read(buffer, &actual), SA_OK);
    auto *data = reinterpret_cast<SaHpiInventoryDataT *>(buffer.data());
    EXPECT_EQ(data->Validity, SAHPI_INVENT_DATA_VALID);
    std::vector<SaHpiInventDataRecordT *> records = recordsOf(data);
    ASSERT_EQ(records.size(), 2u);
    EXPECT_EQ(records[0]->RecordType, SAHPI_INVENT_RECTYPE_CHASSIS_INFO);
    EXPECT_EQ(records[0]->RecordData.ChassisInfo.Type, SAHPI_INVENT_CTYP_RACKMOUNT);
    const SaHpiInventGeneralDataT &g = records[0]->RecordData.ChassisInfo.GeneralData;
    EXPECT_EQ(textOf(*g.Manufacturer), "Kvi Simulated Systems");
    EXPECT_EQ(textOf(*g.SerialNumber), "SIM-CH-0001");
    EXPECT_EQ(g.AssetTag, nullptr);
    ASSERT_NE(customList(&g)[0], nullptr);
    EXPECT_EQ(textOf(*customList(&g)[0]), "Simulated hardware");
    EXPECT_EQ(customList(&g)[1], nullptr);
    EXPECT_EQ(records[1]->RecordType, SAHPI_INVENT_RECTYPE_PRODUCT_INFO);
    // Everything lies inside the caller's buffer.
    const char *begin = reinterpret_cast<const char *>(buffer.data());
    for (const void *p :
         {static_cast<const void *>(records[1]), static_cast<const void *>(g.Manufacturer),
          static_cast<const void *>(customList(&g)[0])}) {
        EXPECT_GE(static_cast<const char *>(p), begin);
        EXPECT_LT(static_cast<const char *>(p), begin + actual);
    }

    const Record &boardInv = rec("Processor board 2", "Inventory");
    std::vector<uint64_t> boardBuffer(512);
    ASSERT_EQ(boardInv.Fn.EntityInventoryDataRead(
                  DOMAIN, rid("Processor board 2"), 0, 4096, boardInv.UserData,
                  reinterpret_cast<SaHpiInventoryDataT *>(boardBuffer.data()), &actual),
              SA_OK);
    records = recordsOf(reinterpret_cast<SaHpiInventoryDataT *>(boardBuffer.data()));
    ASSERT_EQ(records.size(), 3u);
    EXPECT_EQ(textOf(*records[0]->RecordData.BoardInfo.SerialNumber), "SIM-PB-0002");
    EXPECT_EQ(records[2]->RecordType, SAHPI_INVENT_RECTYPE_INTERNAL_USE);
    EXPECT_EQ(records[2]->DataLength, 4u);
    EXPECT_EQ(records[2]->RecordData.InternalUse.Data[0], 0x01);
}

TEST_F(SimulatorTest, InventoryWrittenIsReadBack)
{
    const Record &inv = rec("Power supply 1", "Inventory");
    const SaHpiResourceIdT id = rid("Power supply 1");

    // A product area with two custom fields, and an OEM area, laid out the
    // way a client lays them out: lists running on past their declared end.
    SaHpiTextBufferT name = textBuffer("Replaced supply");
    SaHpiTextBufferT c1 = textBuffer("first"), c2 = textBuffer("second");
    alignas(8) char productBytes[sizeof(SaHpiInventDataRecordT) + 3 * sizeof(void *)] = {};
    auto *product = reinterpret_cast<SaHpiInventDataRecordT *>(productBytes);
    product->RecordType = SAHPI_INVENT_RECTYPE_PRODUCT_INFO;
    product->RecordData.ProductInfo.MfgDateTime = SAHPI_TIME_UNSPECIFIED;
    product->RecordData.ProductInfo.ProductName = &name;
    SaHpiTextBufferT **custom = customList(&product->RecordData.ProductInfo);
    custom[0] = &c1;
    custom[1] = &c2;
    custom[2] = nullptr;
    alignas(8) char oemBytes[sizeof(SaHpiInventDataRecordT)] = {};
    auto *oem = reinterpret_cast<SaHpiInventDataRecordT *>(oemBytes);
    oem->RecordType = SAHPI_INVENT_RECTYPE_OEM;
    oem->DataLength = offsetof(SaHpiInventOemDataT, Data) + 3;
    oem->RecordData.OemData.MId = 99;
    memcpy(tailOf<SaHpiUint8T>(&oem->RecordData.OemData, offsetof(SaHpiInventOemDataT, Data)),
           "\x0a\x0b\x0c", 3);
    alignas(8) char dataBytes[sizeof(SaHpiInventoryDataT) + 2 * sizeof(void *)] = {};
    auto *data = reinterpret_cast<SaHpiInventoryDataT *>(dataBytes);
    data->Validity = SAHPI_INVENT_DATA_VALID;
    SaHpiInventDataRecordT **list = recordList(data);
    list[0] = product;
    list[1] = oem;
    list[2] = nullptr;
    ASSERT_EQ(inv.Fn.EntityInventoryDataWrite(DOMAIN, id, 0, data, inv.UserData), SA_OK);

    std::vector<uint64_t> buffer(1024);
    SaHpiUint32T actual = 0;
    ASSERT_EQ(inv.Fn.EntityInventoryDataRead(DOMAIN, id, 0, 8192, inv.UserData,
                                             reinterpret_cast<SaHpiInventoryDataT *>(buffer.data()),
                                             &actual),
              SA_OK);
    std::vector<SaHpiInventDataRecordT *> records =
        recordsOf(reinterpret_cast<SaHpiInventoryDataT *>(buffer.data()));
    ASSERT_EQ(records.size(), 2u);
    const SaHpiInventGeneralDataT &p = records[0]->RecordData.ProductInfo;
    EXPECT_EQ(textOf(*p.ProductName), "Replaced supply");
    EXPECT_EQ(p.Manufacturer, nullptr);
    EXPECT_EQ(p.MfgDateTime, SAHPI_TIME_UNSPECIFIED);
    SaHpiTextBufferT **readCustom = customList(&p);
    ASSERT_NE(readCustom[0], nullptr);
    ASSERT_NE(readCustom[1], nullptr);
    EXPECT_EQ(textOf(*readCustom[1]), "second");
    EXPECT_EQ(readCustom[2], nullptr);
    EXPECT_EQ(records[1]->RecordType, SAHPI_INVENT_RECTYPE_OEM);
    EXPECT_EQ(records[1]->RecordData.OemData.MId, 99u);
    EXPECT_EQ(records[1]->DataLength, oem->DataLength);
    EXPECT_EQ(records[1]->RecordData.OemData.Data[0], 0x0a);

    // A record of an unknown type is refused and changes nothing.
    oem->RecordType = static_cast<SaHpiInventDataRecordTypeT>(0xB7);
    EXPECT_EQ(inv.Fn.EntityInventoryDataWrite(DOMAIN, id, 0, data, inv.UserData),
              SA_ERR_HPI_INVALID_PARAMS);
    SaHpiUint32T again = 0;
    ASSERT_EQ(inv.Fn.EntityInventoryDataRead(DOMAIN, id, 0, 8192, inv.UserData,
                                             reinterpret_cast<SaHpiInventoryDataT *>(buffer.data()),
                                             &again),
              SA_OK);
    EXPECT_EQ(again, actual);

    // Parameter control brings the manufacturer's inventory back.
    ASSERT_EQ(inv.Fn.RdrDefaultParmControl(DOMAIN, id, nullptr, nullptr, inv.UserData), SA_OK);
    ASSERT_EQ(inv.Fn.EntityInventoryDataRead(DOMAIN, id, 0, 8192, inv.UserData,
                                             reinterpret_cast<SaHpiInventoryDataT *>(buffer.data()),
                                             &actual),
              SA_OK);
    records = recordsOf(reinterpret_cast<SaHpiInventoryDataT *>(buffer.data()));
    EXPECT_EQ(textOf(*records[0]->RecordData.ProductInfo.ProductName), "Power supply");
}

// ---- Watchdog ----

TEST_F(SimulatorTest, WatchdogCountsDownAndActsOnExpiry)
{
    const std::string board = "Processor board 1";
    const Record &w = rec(board, "Watchdog");
    const SaHpiResourceIdT id = rid(board);
    const SaHpiWatchdogNumT num = w.Rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
    auto get = [&] {
        SaHpiWatchdogT out{};
        EXPECT_EQ(w.Fn.WatchdogTimerGet(DOMAIN, id, num, w.UserData, &out), SA_OK);
        return out;
    };
    auto set = [&](SaHpiWatchdogT In) {
        return w.Fn.WatchdogTimerSet(DOMAIN, id, num, &In, w.UserData);
    };
    auto reset = [&] { return w.Fn.WatchdogTimerReset(DOMAIN, id, num, w.UserData); };
    clearLog(board);

    SaHpiWatchdogT initial = get();
    EXPECT_FALSE(initial.Running);
    EXPECT_EQ(initial.InitialCount, 10000u);
    EXPECT_EQ(initial.PresentCount, 10000u);

    auto waitForExpiry = [&] {
        auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        while (get().Running && std::chrono::steady_clock::now() < deadline)
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        return get();
    };

    SaHpiWatchdogT config{};
    config.Log = SAHPI_TRUE;
    config.Running = SAHPI_TRUE; // a stopped timer is not started by a set
    config.TimerUse = SAHPI_WTU_OS_LOAD;
    config.TimerAction = SAHPI_WA_RESET;
    config.PretimerInterrupt = SAHPI_WPI_NMI;
    config.PreTimeoutInterval = 150;
    config.InitialCount = 400;
    ASSERT_EQ(set(config), SA_OK);
    EXPECT_FALSE(get().Running);
    EXPECT_EQ(get().PresentCount, 400u);
    EXPECT_EQ(get().PretimerInterrupt, SAHPI_WPI_NMI);

    ASSERT_EQ(reset(), SA_OK);
    SaHpiWatchdogT running = get();
    EXPECT_TRUE(running.Running);
    EXPECT_LE(running.PresentCount, 400u);
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_LT(get().PresentCount, running.PresentCount) << "it counts down";

    SaHpiWatchdogT expired = waitForExpiry();
    ASSERT_FALSE(expired.Running);
    EXPECT_EQ(expired.PresentCount, 0u);
    EXPECT_EQ(expired.TimerUseExpFlags, SAHPI_WATCHDOG_EXP_OS_LOAD);
    std::vector<SaHpiWatchdogActionEventT> actions;
    for (const SaHpiSelEntryT &e : logEntries(board)) {
        ASSERT_EQ(e.Event.EventType, SAHPI_ET_WATCHDOG);
        actions.push_back(e.Event.EventDataUnion.WatchdogEvent.WatchdogAction);
        EXPECT_EQ(e.Event.EventDataUnion.WatchdogEvent.WatchdogNum, num);
    }
    EXPECT_EQ(actions,
              (std::vector<SaHpiWatchdogActionEventT>{SAHPI_WAE_TIMER_INT, SAHPI_WAE_RESET}));

    config.TimerAction = SAHPI_WA_POWER_DOWN;
    config.PretimerInterrupt = SAHPI_WPI_NONE;
    config.PreTimeoutInterval = 0;
    config.InitialCount = 50;
    ASSERT_EQ(set(config), SA_OK);
    ASSERT_EQ(reset(), SA_OK);
    EXPECT_FALSE(waitForExpiry().Running);
    SaHpiHsPowerStateT state = SAHPI_HS_POWER_ON;
    const Resource &b = res(board);
    ASSERT_EQ(b.Fn.ResourcePowerStateGet(DOMAIN, id, b.UserDefined, &state), SA_OK);
    EXPECT_EQ(state, SAHPI_HS_POWER_OFF) << "the expiry powered the board down";
    ASSERT_EQ(power(board, SAHPI_HS_POWER_ON), SA_OK);

    // Once the pre-timeout fired, only the expiry ends the countdown.
    config.PretimerInterrupt = SAHPI_WPI_SMI;
    config.PreTimeoutInterval = config.InitialCount = 2000;
    ASSERT_EQ(set(config), SA_OK);
    ASSERT_EQ(reset(), SA_OK);
    auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(2);
    SaErrorT rc = SA_OK;
    while ((rc = reset()) == SA_OK && std::chrono::steady_clock::now() < deadline)
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_EQ(rc, SA_ERR_HPI_INVALID_REQUEST);

    // A set that keeps it running restarts it; one that stops it stops it.
    config.PreTimeoutInterval = 0;
    config.InitialCount = 60000;
    config.TimerUseExpFlags = SAHPI_WATCHDOG_EXP_OS_LOAD; // clears the flag
    ASSERT_EQ(set(config), SA_OK);
    EXPECT_TRUE(get().Running);
    EXPECT_GT(get().PresentCount, 50000u);
    EXPECT_EQ(get().TimerUseExpFlags, 0);
    config.Running = SAHPI_FALSE;
    ASSERT_EQ(set(config), SA_OK);
    EXPECT_FALSE(get().Running);

    SaHpiWatchdogT bad = config;
    bad.PreTimeoutInterval = bad.InitialCount + 1;
    EXPECT_EQ(set(bad), SA_ERR_HPI_INVALID_DATA);
    bad = config;
    bad.TimerAction = static_cast<SaHpiWatchdogActionT>(7);
    EXPECT_EQ(set(bad), SA_ERR_HPI_INVALID_PARAMS);
    bad = config;
    bad.TimerUse = static_cast<SaHpiWatchdogTimerUseT>(9);
    EXPECT_EQ(set(bad), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(w.Fn.RdrDefaultParmControl(DOMAIN, id, nullptr, nullptr, w.UserData), SA_OK);
    EXPECT_EQ(get().InitialCount, 10000u);
}

// ---- Event log ----

TEST_F(SimulatorTest, EventLogAddsGetsDeletesClearsAndWraps)
{
    const std::string tag = "Fan tray 1";
    const Resource &r = res(tag);
    const SaHpiResourceIdT id = r.Entry.ResourceId;
    clearLog(tag);
    auto info = [&] {
        SaHpiSelInfoT out{};
        EXPECT_EQ(r.Fn.EventLogInfoGet(DOMAIN, id, r.UserDefined, &out), SA_OK);
        return out;
    };
    auto add = [&](SaHpiUint8T Mark) {
        SaHpiSelEntryT e{};
        e.Event.Source = id;
        e.Event.EventType = SAHPI_ET_USER;
        e.Event.Severity = SAHPI_INFORMATIONAL;
        e.Event.EventDataUnion.UserEvent.UserEventData[0] = Mark;
        return r.Fn.EventLogEntryAdd(DOMAIN, id, &e, r.UserDefined);
    };
    auto marks = [&] {
        std::vector<int> out;
        for (const SaHpiSelEntryT &e : logEntries(tag))
            out.push_back(e.Event.EventDataUnion.UserEvent.UserEventData[0]);
        return out;
    };
    SaHpiSelInfoT i = info();
    EXPECT_EQ(i.Entries, 0u);
    EXPECT_EQ(i.Size, 4u);
    EXPECT_TRUE(i.Enabled);
    EXPECT_TRUE(i.DeleteEntrySupported);
    SaHpiSelEntryIdT prev = 0, next = 0;
    SaHpiSelEntryT entry{};
    EXPECT_EQ(r.Fn.EventLogEntryGet(DOMAIN, id, SAHPI_OLDEST_ENTRY, r.UserDefined, &prev, &next,
                                    &entry, nullptr, nullptr),
              SA_ERR_HPI_NOT_PRESENT);

    for (SaHpiUint8T m : {1, 2, 3})
        ASSERT_EQ(add(m), SA_OK);
    std::vector<SaHpiSelEntryT> entries = logEntries(tag);
    ASSERT_EQ(entries.size(), 3u);
    EXPECT_EQ(marks(), (std::vector<int>{1, 2, 3}));
    ASSERT_EQ(r.Fn.EventLogEntryGet(DOMAIN, id, SAHPI_NEWEST_ENTRY, r.UserDefined, &prev, &next,
                                    &entry, nullptr, nullptr),
              SA_OK);
    EXPECT_EQ(entry.EntryId, entries[2].EntryId);
    EXPECT_EQ(prev, entries[1].EntryId);

    ASSERT_EQ(r.Fn.EventLogEntryDelete(DOMAIN, id, entries[1].EntryId, r.UserDefined), SA_OK);
    EXPECT_EQ(marks(), (std::vector<int>{1, 3}));
    EXPECT_EQ(r.Fn.EventLogEntryDelete(DOMAIN, id, entries[1].EntryId, r.UserDefined),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(r.Fn.EventLogEntryGet(DOMAIN, id, entries[1].EntryId, r.UserDefined, &prev, &next,
                                    &entry, nullptr, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(r.Fn.EventLogEntryGet(DOMAIN, id, SAHPI_NO_MORE_ENTRIES, r.UserDefined, &prev, &next,
                                    &entry, nullptr, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);

    // Full: the oldest goes, ids are not reused.
    for (SaHpiUint8T m : {4, 5, 6})
        ASSERT_EQ(add(m), SA_OK);
    EXPECT_EQ(marks(), (std::vector<int>{3, 4, 5, 6}));
    i = info();
    EXPECT_EQ(i.Entries, 4u);
    EXPECT_TRUE(i.OverflowFlag);
    EXPECT_GT(logEntries(tag).back().EntryId, entries[2].EntryId);

    clearLog(tag);
    i = info();
    EXPECT_EQ(i.Entries, 0u);
    EXPECT_FALSE(i.OverflowFlag);

    SaHpiSelEntryT badEntry{};
    badEntry.Event.EventType = static_cast<SaHpiEventTypeT>(5);
    EXPECT_EQ(r.Fn.EventLogEntryAdd(DOMAIN, id, &badEntry, r.UserDefined),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(r.Fn.EventLogEntryAdd(DOMAIN, id, nullptr, r.UserDefined), SA_ERR_HPI_INVALID_PARAMS);
}

TEST_F(SimulatorTest, EventLogClockAndStateAreTheLogsOwn)
{
    const std::string tag = "Power supply 1";
    const Resource &r = res(tag);
    const SaHpiResourceIdT id = r.Entry.ResourceId;
    SaHpiTimeT now = 0, logTime = 0;
    ASSERT_EQ(kviCsGetSaHpiTime(&now), SA_OK);
    const SaHpiTimeT hour = 3600LL * 1000000000LL;
    ASSERT_EQ(r.Fn.EventLogTimeSet(DOMAIN, id, now + hour, r.UserDefined), SA_OK);
    ASSERT_EQ(r.Fn.EventLogTimeGet(DOMAIN, id, r.UserDefined, &logTime), SA_OK);
    EXPECT_NEAR(static_cast<double>(logTime - now), static_cast<double>(hour), 1e9);
    EXPECT_EQ(r.Fn.EventLogTimeSet(DOMAIN, id, SAHPI_TIME_UNSPECIFIED, r.UserDefined),
              SA_ERR_HPI_INVALID_PARAMS);

    // Disabled, the log takes clients' entries but not the resource's own.
    clearLog(tag);
    SaHpiBoolT enabled = SAHPI_TRUE;
    ASSERT_EQ(r.Fn.EventLogStateSet(DOMAIN, id, SAHPI_FALSE, r.UserDefined), SA_OK);
    ASSERT_EQ(r.Fn.EventLogStateGet(DOMAIN, id, r.UserDefined, &enabled), SA_OK);
    EXPECT_FALSE(enabled);
    ASSERT_EQ(power(tag, SAHPI_HS_POWER_OFF), SA_OK);
    ASSERT_EQ(power(tag, SAHPI_HS_POWER_ON), SA_OK);
    EXPECT_TRUE(logEntries(tag).empty());
    SaHpiSelEntryT e{};
    e.Event.EventType = SAHPI_ET_USER;
    e.Event.Severity = SAHPI_OK;
    ASSERT_EQ(r.Fn.EventLogEntryAdd(DOMAIN, id, &e, r.UserDefined), SA_OK);
    std::vector<SaHpiSelEntryT> entries = logEntries(tag);
    ASSERT_EQ(entries.size(), 1u);
    EXPECT_NEAR(static_cast<double>(entries[0].Timestamp - now), static_cast<double>(hour), 5e9)
        << "stamped with the log's clock";
    EXPECT_EQ(r.Fn.EventLogStateSet(DOMAIN, id, 2, r.UserDefined), SA_ERR_HPI_INVALID_PARAMS);

    // Enabled again, powering the supply off and on logs its sensors' changes.
    auto statusAssertions = [&] {
        SaHpiEventStateT states = 0;
        for (const SaHpiSelEntryT &x : logEntries(tag))
            if (x.Event.EventType == SAHPI_ET_SENSOR &&
                x.Event.EventDataUnion.SensorEvent.SensorType == SAHPI_POWER_SUPPLY &&
                x.Event.EventDataUnion.SensorEvent.Assertion)
                states |= x.Event.EventDataUnion.SensorEvent.EventState;
        return states;
    };
    ASSERT_EQ(r.Fn.EventLogStateSet(DOMAIN, id, SAHPI_TRUE, r.UserDefined), SA_OK);
    clearLog(tag);
    ASSERT_EQ(power(tag, SAHPI_HS_POWER_OFF), SA_OK);
    EXPECT_EQ(statusAssertions(), SAHPI_ES_POWER_OFF);
    clearLog(tag);
    ASSERT_EQ(power(tag, SAHPI_HS_POWER_ON), SA_OK);
    EXPECT_EQ(statusAssertions(), SAHPI_ES_RUNNING);
    ASSERT_EQ(r.Fn.EventLogTimeSet(DOMAIN, id, now, r.UserDefined), SA_OK);
}

// ---- Hot swap and parameter control ----

TEST_F(SimulatorTest, HotSwapSlotsKeepTheirState)
{
    const Resource &r = res("Processor board 2");
    const SaHpiResourceIdT id = r.Entry.ResourceId;
    auto state = [&] {
        SaHpiHsStateT s = SAHPI_HS_STATE_NOT_PRESENT;
        EXPECT_EQ(r.Fn.HotSwapStateGet(DOMAIN, id, r.UserDefined, &s), SA_OK);
        return s;
    };
    EXPECT_EQ(state(), SAHPI_HS_STATE_ACTIVE_HEALTHY);
    EXPECT_EQ(r.Fn.ResourceActiveSet(DOMAIN, id, r.UserDefined), SA_ERR_HPI_INVALID_REQUEST);
    ASSERT_EQ(r.Fn.HotSwapActionRequest(DOMAIN, id, SAHPI_HS_ACTION_EXTRACTION, r.UserDefined),
              SA_OK);
    EXPECT_EQ(state(), SAHPI_HS_STATE_INACTIVE) << "nobody manages it: at once";
    EXPECT_EQ(r.Fn.HotSwapActionRequest(DOMAIN, id, SAHPI_HS_ACTION_EXTRACTION, r.UserDefined),
              SA_ERR_HPI_INVALID_REQUEST);
    ASSERT_EQ(r.Fn.HotSwapControlRequest(DOMAIN, id, r.UserDefined), SA_OK);
    ASSERT_EQ(r.Fn.HotSwapActionRequest(DOMAIN, id, SAHPI_HS_ACTION_INSERTION, r.UserDefined),
              SA_OK);
    EXPECT_EQ(state(), SAHPI_HS_STATE_INSERTION_PENDING);
    ASSERT_EQ(r.Fn.ResourceActiveSet(DOMAIN, id, r.UserDefined), SA_OK);
    EXPECT_EQ(state(), SAHPI_HS_STATE_ACTIVE_HEALTHY);
    ASSERT_EQ(r.Fn.HotSwapActionRequest(DOMAIN, id, SAHPI_HS_ACTION_EXTRACTION, r.UserDefined),
              SA_OK);
    ASSERT_EQ(r.Fn.ResourceInactiveSet(DOMAIN, id, r.UserDefined), SA_OK);
    EXPECT_EQ(state(), SAHPI_HS_STATE_INACTIVE);
    ASSERT_EQ(r.Fn.HotSwapActionRequest(DOMAIN, id, SAHPI_HS_ACTION_INSERTION, r.UserDefined),
              SA_OK);
    ASSERT_EQ(r.Fn.ResourceActiveSet(DOMAIN, id, r.UserDefined), SA_OK);

    SaHpiHsIndicatorStateT indicator = SAHPI_HS_INDICATOR_OFF;
    ASSERT_EQ(r.Fn.HotSwapIndicatorStateSet(DOMAIN, id, SAHPI_HS_INDICATOR_ON, r.UserDefined),
              SA_OK);
    ASSERT_EQ(r.Fn.HotSwapIndicatorStateGet(DOMAIN, id, r.UserDefined, &indicator), SA_OK);
    EXPECT_EQ(indicator, SAHPI_HS_INDICATOR_ON);
    EXPECT_EQ(r.Fn.HotSwapIndicatorStateSet(DOMAIN, id, static_cast<SaHpiHsIndicatorStateT>(2),
                                            r.UserDefined),
              SA_ERR_HPI_INVALID_PARAMS);
    SaHpiTimeoutT timeout = 0;
    ASSERT_EQ(r.Fn.AutoExtractTimeoutSet(DOMAIN, id, SAHPI_TIMEOUT_BLOCK, r.UserDefined), SA_OK);
    ASSERT_EQ(r.Fn.AutoExtractTimeoutGet(DOMAIN, id, r.UserDefined, &timeout), SA_OK);
    EXPECT_EQ(timeout, SAHPI_TIMEOUT_BLOCK);
    EXPECT_EQ(r.Fn.AutoExtractTimeoutSet(DOMAIN, id, -2, r.UserDefined), SA_ERR_HPI_INVALID_PARAMS);

    // The resource's own default puts the hot-swap settings back.
    ASSERT_EQ(r.Fn.RptDefaultParmControl(DOMAIN, id), SA_OK);
    ASSERT_EQ(r.Fn.AutoExtractTimeoutGet(DOMAIN, id, r.UserDefined, &timeout), SA_OK);
    EXPECT_NE(timeout, SAHPI_TIMEOUT_BLOCK);
    EXPECT_EQ(r.Fn.RptDefaultParmControl(DOMAIN, 999), SA_ERR_HPI_INVALID_RESOURCE);
}

TEST_F(SimulatorTest, RecordParametersAreDefaultedSavedAndRestored)
{
    const std::string chassis = "Chassis 1";
    const Record &r = rec(chassis, "Display brightness");
    auto slot = [&](int Action, SaHpiBoolT Daemon = SAHPI_FALSE) {
        SaHpiRdrT rdr = r.Rdr;
        KviDsRdrFnTable fn = r.Fn;
        switch (Action) {
        case 0:
            return r.Fn.RdrDefaultParmControl(DOMAIN, rid(chassis), &rdr, &fn, r.UserData);
        case 1:
            return r.Fn.RdrSaveParmControl(DOMAIN, rid(chassis), &rdr, &fn, r.UserData);
        default:
            return r.Fn.RdrRestoreParmControl(DOMAIN, rid(chassis), Daemon, &rdr, &fn, r.UserData);
        }
    };
    // Saving and restoring go through the library's store.
    SaHpiCtrlStateT s{};
    s.Type = SAHPI_CTRL_TYPE_ANALOG;
    s.StateUnion.Analog = 10;
    ASSERT_EQ(setControl(chassis, "Display brightness", s), SA_OK);
    ASSERT_EQ(slot(1), SA_OK);
    s.StateUnion.Analog = 90;
    ASSERT_EQ(setControl(chassis, "Display brightness", s), SA_OK);
    ASSERT_EQ(slot(2), SA_OK);
    EXPECT_EQ(control(chassis, "Display brightness").StateUnion.Analog, 10);
    ASSERT_EQ(slot(0), SA_OK);
    EXPECT_EQ(control(chassis, "Display brightness").StateUnion.Analog, 75);

    // Sensors: thresholds and enables.
    const std::string board = "Processor board 2";
    const Record &cpu = rec(board, "CPU temperature");
    SaHpiSensorThresholdsT t{};
    t.UpMinor.ValuesPresent = SAHPI_SRF_RAW;
    t.UpMinor.Raw = 50;
    ASSERT_EQ(setThresholds(board, "CPU temperature", t), SA_OK);
    ASSERT_EQ(cpu.Fn.RdrDefaultParmControl(DOMAIN, rid(board), nullptr, nullptr, cpu.UserData),
              SA_OK);
    EXPECT_EQ(thresholds(board, "CPU temperature").UpMinor.Raw, 70u);
}

// ---- The example configuration ----

#ifdef KVI_SIMULATOR_EXAMPLE
TEST(SimulatorExampleTest, ExampleConfigurationNamesTheBuiltSimulatorAndSizesTheShelf)
{
    KviCsCfgContainer config{};
    ASSERT_EQ(kviCsConfigInitStructure(&config, SAHPI_FALSE, KVI_SIMULATOR_EXAMPLE), SA_OK);
    char modules[2048] = "";
    ASSERT_EQ(kviCsCfgDataGet("mapl_modules", sizeof(modules), modules, &config), SA_OK);
    // Relative to the build directory, which is where the demo starts the daemon.
    EXPECT_EQ(std::string(KVI_SIMULATOR_BUILD_DIR) + "/" + modules, simulatorPath());
    for (const char *key : {"KviSimProcessorBoards", "KviSimFanTrays", "KviSimFans",
                            "KviSimPowerSupplies", "KviSimEventLogSize", "KviMaxNvObjects"}) {
        SaHpiUint32T value = 0;
        EXPECT_EQ(kviCsCfgDataUint32Get(key, &value, &config), SA_OK) << key;
        EXPECT_GT(value, 0u) << key;
    }
    char dir[300] = "";
    EXPECT_EQ(kviCsCfgDataGet("KviNvStorageDir", sizeof(dir), dir, &config), SA_OK);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&config), SA_OK);
}
#endif

// ---- Unloading ----

TEST_F(SimulatorTest, UnloadingRemovesTheShelfAndFreesItsMemory)
{
    // A running watchdog must not keep the plug-in's thread busy past its end.
    const Record &w = rec("Processor board 2", "Watchdog");
    SaHpiWatchdogT config{};
    config.Running = SAHPI_TRUE;
    config.TimerUse = SAHPI_WTU_SMS_OS;
    config.InitialCount = 100000;
    ASSERT_EQ(w.Fn.WatchdogTimerSet(DOMAIN, rid("Processor board 2"), 0, &config, w.UserData),
              SA_OK);
    ASSERT_EQ(w.Fn.WatchdogTimerReset(DOMAIN, rid("Processor board 2"), 0, w.UserData), SA_OK);

    ASSERT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    SaHpiEntryIdT next = 0;
    SaHpiRptEntryT entry{};
    EXPECT_EQ(kviCsRptActiveEntryGet(DOMAIN, SAHPI_FIRST_ENTRY, &next, &entry, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), baselineBlocks_);
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);

    // Loaded again, the same shelf comes back under new ids.
    load();
    EXPECT_EQ(shelf_.ByTag.size(), 5u);
    EXPECT_EQ(shelf_.Order, (std::vector<SaHpiResourceIdT>{10, 6, 7, 8, 9}));
}

} // namespace
