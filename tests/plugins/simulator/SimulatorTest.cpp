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

using Str = const std::string &;
const std::string CHASSIS = "Chassis 1", BOARD1 = "Processor board 1", BOARD2 = "Processor board 2",
                  TRAY = "Fan tray 1", PSU = "Power supply 1";

// What a getter slot wrote, expecting it to answer SA_OK.
template <typename T, typename Call> T got(Call call)
{
    T out{};
    EXPECT_EQ(call(&out), SA_OK);
    return out;
}

// A logged OS-load timer, asked to run.
SaHpiWatchdogT timer(SaHpiWatchdogActionT Action, SaHpiWatchdogPretimerInterruptT Interrupt,
                     SaHpiUint32T PreTimeout, SaHpiUint32T Initial)
{
    SaHpiWatchdogT w{};
    w.Log = w.Running = SAHPI_TRUE;
    w.TimerUse = SAHPI_WTU_OS_LOAD;
    w.TimerAction = Action;
    w.PretimerInterrupt = Interrupt;
    w.PreTimeoutInterval = PreTimeout;
    w.InitialCount = Initial;
    return w;
}

template <typename V> SaHpiCtrlStateT ctrlState(SaHpiCtrlTypeT Type, V Value)
{
    SaHpiCtrlStateT s;
    memset(&s, 0, sizeof(s));
    s.Type = Type;
    memcpy(&s.StateUnion, &Value, sizeof(Value));
    return s;
}

SaHpiSensorReadingT rawReading(SaHpiUint32T Raw, SaHpiSensorReadingFormatsT Present = SAHPI_SRF_RAW)
{
    SaHpiSensorReadingT r{};
    r.ValuesPresent = Present;
    r.Raw = Raw;
    return r;
}

template <typename V> SaHpiSensorReadingT interpreted(SaHpiSensorInterpretedTypeT Type, V Value)
{
    SaHpiSensorReadingT r{};
    r.ValuesPresent = SAHPI_SRF_INTERPRETED;
    r.Interpreted.Type = Type;
    memcpy(&r.Interpreted.Value, &Value, sizeof(Value));
    return r;
}

// The one-element tail arrays of the inventory types run on past their
// declared end; reach them through their byte address.
template <typename T> T *tailOf(const void *Object, size_t Offset)
{
    return reinterpret_cast<T *>(const_cast<char *>(static_cast<const char *>(Object)) + Offset);
}

SaHpiTextBufferT **customList(const SaHpiInventGeneralDataT *General)
{
    return tailOf<SaHpiTextBufferT *>(General, offsetof(SaHpiInventGeneralDataT, CustomField));
}

SaHpiInventDataRecordT **recordList(const void *Data)
{
    return tailOf<SaHpiInventDataRecordT *>(Data, offsetof(SaHpiInventoryDataT, DataRecords));
}

// One shelf for the whole suite; a test puts back what the others rely on.
class SimulatorTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        dir_ = new KviTempDir;
        const std::string config =
            "mapl_modules = \"" + simulatorPath() + "\"\nmax_mapl_rwlocks_count = \"" +
            std::to_string(LOCKS) +
            "\"\nKviSimProcessorBoards = \"2\"\nKviSimFanTrays = \"1\"\nKviSimFans = \"3\"\n"
            "KviSimPowerSupplies = \"1\"\nKviSimEventLogSize = \"4\"\nKviNvStorageDir = \"" +
            dir_->path() + "\"\n";
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

    static Resource &res(Str Tag) { return shelf_.ByTag.at(Tag); }

    static Record &rec(Str Tag, Str Id)
    {
        static Record none{};
        for (Record &r : res(Tag).Records)
            if (textOf(r.Rdr.IdString) == Id)
                return r;
        ADD_FAILURE() << "no record " << Id << " on " << Tag;
        return none;
    }

    static SaHpiResourceIdT rid(Str Tag) { return res(Tag).Entry.ResourceId; }

    // Slot calls as the front end makes them; the simulator finds the record
    // by its user data, not by the number passed.
    static SaHpiSensorReadingT reading(Str Tag, Str Id)
    {
        Record &r = rec(Tag, Id);
        return got<SaHpiSensorReadingT>([&](auto *Out) {
            return r.Fn.SensorReadingGet(DOMAIN, rid(Tag), 0, 0, &r.Rdr, r.UserData, Out);
        });
    }

    static SaHpiSensorThresholdsT thresholds(Str Tag, Str Id)
    {
        Record &r = rec(Tag, Id);
        return got<SaHpiSensorThresholdsT>([&](auto *Out) {
            return r.Fn.SensorThresholdsGet(DOMAIN, rid(Tag), 0, &r.Rdr, r.UserData, Out);
        });
    }

    static SaErrorT setThresholds(Str Tag, Str Id, SaHpiSensorThresholdsT T)
    {
        Record &r = rec(Tag, Id);
        return r.Fn.SensorThresholdsSet(DOMAIN, rid(Tag), 0, &r.Rdr, &T, r.UserData);
    }

    static SaErrorT setControl(Str Tag, Str Id, SaHpiCtrlStateT S)
    {
        return rec(Tag, Id).Fn.ControlStateSet(DOMAIN, rid(Tag), 0, &S, rec(Tag, Id).UserData);
    }

    static SaHpiCtrlStateT control(Str Tag, Str Id, SaHpiTxtLineNumT Line = SAHPI_TLN_ALL_LINES)
    {
        Record &r = rec(Tag, Id);
        SaHpiCtrlStateT out{};
        out.Type = r.Rdr.RdrTypeUnion.CtrlRec.Type;
        out.StateUnion.Text.Line = Line; // the line a text control is asked for
        EXPECT_EQ(r.Fn.ControlStateGet(DOMAIN, rid(Tag), 0, r.UserData, &out), SA_OK);
        return out;
    }

    static SaErrorT power(Str Tag, SaHpiHsPowerStateT State)
    {
        return res(Tag).Fn.ResourcePowerStateSet(DOMAIN, rid(Tag), State, res(Tag).UserDefined);
    }

    static SaHpiHsPowerStateT powerState(Str Tag)
    {
        return got<SaHpiHsPowerStateT>([&](auto *Out) {
            return res(Tag).Fn.ResourcePowerStateGet(DOMAIN, rid(Tag), res(Tag).UserDefined, Out);
        });
    }

    static SaErrorT entryGet(Str Tag, SaHpiSelEntryIdT Id, SaHpiSelEntryT *Entry,
                             SaHpiSelEntryIdT *Prev, SaHpiSelEntryIdT *Next,
                             SaHpiRdrT *Rdr = nullptr, SaHpiRptEntryT *Rpt = nullptr)
    {
        return res(Tag).Fn.EventLogEntryGet(DOMAIN, rid(Tag), Id, res(Tag).UserDefined, Prev, Next,
                                            Entry, Rdr, Rpt);
    }

    // The log walked from the oldest entry on.
    static std::vector<SaHpiSelEntryT> logEntries(Str Tag)
    {
        std::vector<SaHpiSelEntryT> out;
        SaHpiSelEntryT entry{};
        SaHpiSelEntryIdT prev = 0, id = SAHPI_OLDEST_ENTRY;
        while (id != SAHPI_NO_MORE_ENTRIES) {
            SaErrorT rc = entryGet(Tag, id, &entry, &prev, &id);
            EXPECT_EQ(rc, out.empty() && rc == SA_ERR_HPI_NOT_PRESENT ? rc : SA_OK);
            if (rc != SA_OK)
                break;
            out.push_back(entry);
        }
        return out;
    }

    static void clearLog(Str Tag)
    {
        ASSERT_EQ(res(Tag).Fn.EventLogClear(DOMAIN, rid(Tag), res(Tag).UserDefined), SA_OK);
    }

    // Reads a resource's inventory into Buffer; returns its records (none when
    // the read fails as expected).
    static std::vector<SaHpiInventDataRecordT *> readInventory(Str Tag,
                                                               std::vector<uint64_t> &Buffer,
                                                               SaHpiUint32T *Actual,
                                                               SaErrorT Expect = SA_OK)
    {
        Record &inv = rec(Tag, "Inventory");
        auto *data = reinterpret_cast<SaHpiInventoryDataT *>(Buffer.data());
        auto size = static_cast<SaHpiUint32T>(Buffer.size() * sizeof(uint64_t));
        EXPECT_EQ(inv.Fn.EntityInventoryDataRead(DOMAIN, 0, 0, size, inv.UserData, data, Actual),
                  Expect);
        std::vector<SaHpiInventDataRecordT *> out;
        for (auto **r = recordList(data); Expect == SA_OK && *r != nullptr; r++)
            out.push_back(*r);
        return out;
    }

    inline static KviTempDir *dir_ = nullptr;
    inline static Shelf shelf_;
    inline static SaHpiInt32T baselineBlocks_ = 0;
};

// ---- The shelf as a client walks it ----

TEST_F(SimulatorTest, ShelfIsSizedByItsKeysAndSpreadOverThePluginsLocks)
{
    // A chassis, two boards, one fan tray (three fans) and one supply: ids 1
    // to 5, walked by id modulo 5.
    EXPECT_EQ(shelf_.Order, (std::vector<SaHpiResourceIdT>{5, 1, 2, 3, 4}));
    ASSERT_EQ(kviDsMaplManagerDiscoverResources(DOMAIN), SA_OK);
    EXPECT_EQ(walkShelf().Order, shelf_.Order) << "a second discovery adds nothing";
    const SaHpiCapabilitiesT common = SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_RDR |
                                      SAHPI_CAPABILITY_SENSOR | SAHPI_CAPABILITY_CONTROL |
                                      SAHPI_CAPABILITY_INVENTORY_DATA | SAHPI_CAPABILITY_SEL |
                                      SAHPI_CAPABILITY_CONFIGURATION;
    const SaHpiCapabilitiesT watchdog = SAHPI_CAPABILITY_WATCHDOG;
    const struct {
        const std::string &tag;
        SaHpiEntityTypeT entity;
        SaHpiCapabilitiesT capabilities;
        std::vector<size_t> counts; // controls, sensors, inventories, watchdogs
    } expected[] = {
        {CHASSIS, SAHPI_ENT_SYSTEM_CHASSIS, common, {6, 2, 1, 0}},
        {BOARD1, SAHPI_ENT_PROCESSOR_BOARD, common | watchdog, {1, 3, 1, 1}},
        {BOARD2, SAHPI_ENT_PROCESSOR_BOARD, common | watchdog, {1, 3, 1, 1}},
        {TRAY, SAHPI_ENT_COOLING_UNIT, common, {1, 3, 1, 0}},
        {PSU, SAHPI_ENT_POWER_SUPPLY, common, {1, 3, 1, 0}},
    };
    std::vector<KviCsRwLockT *> locks(LOCKS);
    for (SaHpiUint32T i = 0; i < LOCKS; i++)
        ASSERT_EQ(kviDsMaplManagerUnprotectedGetMaplLock(res(CHASSIS).MaplNum, i, &locks[i]),
                  SA_OK);
    std::map<KviCsRwLockT *, int> used;
    for (const auto &e : expected) {
        SCOPED_TRACE(e.tag);
        const Resource &r = res(e.tag);
        EXPECT_EQ(r.Entry.ResourceCapabilities & (common | watchdog), e.capabilities);
        EXPECT_EQ(r.Entry.ResourceEntity.Entry[0].EntityType, e.entity);
        EXPECT_EQ(r.Entry.EntryId, r.Entry.ResourceId);
        EXPECT_NE(std::find(locks.begin(), locks.end(), r.Lock), locks.end());
        used[r.Lock]++;
        std::vector<size_t> counts(4);
        for (const Record &x : r.Records)
            counts.at(x.Rdr.RdrType - 1)++;
        EXPECT_EQ(counts, e.counts);
    }
    EXPECT_EQ(used.size(), LOCKS) << "resources are spread over the plug-in's locks";

    // Every slot of both tables is filled.
    const void *const *rpt = reinterpret_cast<const void *const *>(&res(BOARD1).Fn);
    for (size_t i = 0; i < sizeof(KviDsRptFnTable) / sizeof(void *); i++)
        EXPECT_NE(rpt[i], nullptr) << "RPT slot " << i + 1;
    const void *const *rdr = reinterpret_cast<const void *const *>(&res(BOARD1).Records[0].Fn);
    for (size_t i = 0; i < sizeof(KviDsRdrFnTable) / sizeof(void *); i++)
        EXPECT_NE(rdr[i], nullptr) << "RDR slot " << i + 1;

    // The default watchdog and inventory of a resource are the simulator's.
    SaHpiRdrT found{};
    SaHpiBoolT active = SAHPI_FALSE;
    EXPECT_EQ(kviCsRdrGetWatchdog(DOMAIN, rid(BOARD1), SAHPI_DEFAULT_WATCHDOG_NUM, &found, &active,
                                  nullptr, nullptr, nullptr, nullptr),
              SA_OK);
    EXPECT_EQ(kviCsRdrGetEir(DOMAIN, rid(TRAY), SAHPI_DEFAULT_INVENTORY_ID, &found, &active,
                             nullptr, nullptr, nullptr, nullptr),
              SA_OK);
}

TEST_F(SimulatorTest, SlotsRefuseMissingOutputsAndRecordsOfAnotherType)
{
    Record &v12 = rec(BOARD1, "Board 12V"), &led = rec(BOARD1, "Health LED");
    Resource &b = res(BOARD1);
    SaHpiSensorReadingT out{};
    SaHpiSelEntryT entry{};
    for (SaErrorT rc : {v12.Fn.SensorReadingGet(DOMAIN, 1, 1, 1, nullptr, v12.UserData, nullptr),
                        v12.Fn.SensorReadingGet(DOMAIN, 1, 1, 1, nullptr, led.UserData, &out),
                        b.Fn.ResourceResetStateGet(DOMAIN, 1, b.UserDefined, nullptr),
                        b.Fn.EventLogEntryAdd(DOMAIN, 1, nullptr, b.UserDefined),
                        b.Fn.EventLogEntryAdd(DOMAIN, 1, &entry, nullptr)})
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
}

// ---- Sensors ----

TEST_F(SimulatorTest, ReadingsConvertThroughTheRecordsFactors)
{
    // value = M * raw * 10^ExpR with the factors the client finds in the record.
    const SaHpiSensorReadingT r = reading(BOARD1, "Board 3.3V");
    const SaHpiSensorFactorsT &f =
        rec(BOARD1, "Board 3.3V").Rdr.RdrTypeUnion.SensorRec.DataFormat.Factors;
    EXPECT_EQ(r.ValuesPresent, SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED | SAHPI_SRF_EVENT_STATE);
    EXPECT_EQ(r.Raw, 165u);
    EXPECT_NEAR(r.Interpreted.Value.SensorFloat32, f.M_Factor * 165 * std::pow(10.0, f.ExpR), 1e-4);

    SaHpiSensorReadingT out{};
    auto convert = [&](Str Tag, const char *Id, SaHpiSensorReadingT In) {
        Record &x = rec(Tag, Id);
        return x.Fn.SensorReadingConvert(DOMAIN, rid(Tag), 0, &x.Rdr, &In, x.UserData, &out);
    };
    ASSERT_EQ(convert(BOARD1, "Board 12V", rawReading(200)), SA_OK);
    EXPECT_EQ(out.ValuesPresent, SAHPI_SRF_INTERPRETED);
    EXPECT_NEAR(out.Interpreted.Value.SensorFloat32, 12.0, 1e-4);
    ASSERT_EQ(convert(BOARD1, "Board 12V", interpreted(SAHPI_SENSOR_INTERPRETED_TYPE_INT32, 12)),
              SA_OK);
    EXPECT_EQ(out.ValuesPresent, SAHPI_SRF_RAW);
    EXPECT_EQ(out.Raw, 200u);

    const struct {
        const char *what;
        SaHpiSensorReadingT in;
        SaErrorT rc;
    } bad[] = {
        {"no form", rawReading(0, 0), SA_ERR_HPI_INVALID_PARAMS},
        {"both forms", rawReading(1, SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED),
         SA_ERR_HPI_INVALID_PARAMS},
        {"raw above 255", rawReading(256), SA_ERR_HPI_INVALID_DATA},
        {"below raw 0", interpreted(SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32, -5.0f),
         SA_ERR_HPI_INVALID_DATA},
    };
    for (const auto &b : bad)
        EXPECT_EQ(convert(BOARD1, "Board 12V", b.in), b.rc) << b.what;
    EXPECT_EQ(convert(PSU, "Supply status", rawReading(0)), SA_ERR_HPI_INVALID_CMD) << "discrete";
}

TEST_F(SimulatorTest, ReadingsFollowPowerResetAndControls)
{
    ASSERT_EQ(power(BOARD2, SAHPI_HS_POWER_OFF), SA_OK);
    EXPECT_EQ(powerState(BOARD2), SAHPI_HS_POWER_OFF);
    EXPECT_EQ(reading(BOARD2, "Board 3.3V").Raw, 0u);
    EXPECT_EQ(reading(BOARD2, "Board 3.3V").EventStatus.EventStatus,
              SAHPI_ES_LOWER_MINOR | SAHPI_ES_LOWER_MAJOR | SAHPI_ES_LOWER_CRIT);
    ASSERT_EQ(power(BOARD2, SAHPI_HS_POWER_CYCLE), SA_OK);
    EXPECT_EQ(powerState(BOARD2), SAHPI_HS_POWER_ON);
    EXPECT_EQ(reading(BOARD2, "Board 3.3V").EventStatus.EventStatus, 0);
    EXPECT_EQ(power(BOARD2, static_cast<SaHpiHsPowerStateT>(3)), SA_ERR_HPI_INVALID_PARAMS);

    Resource &b = res(BOARD2);
    auto reset = [&](SaHpiResetActionT A) {
        return b.Fn.ResourceResetStateSet(DOMAIN, rid(BOARD2), A, b.UserDefined);
    };
    auto resetState = [&] {
        return got<SaHpiResetActionT>([&](auto *Out) {
            return b.Fn.ResourceResetStateGet(DOMAIN, rid(BOARD2), b.UserDefined, Out);
        });
    };
    ASSERT_EQ(reset(SAHPI_RESET_ASSERT), SA_OK);
    EXPECT_EQ(resetState(), SAHPI_RESET_ASSERT);
    EXPECT_EQ(reading(BOARD2, "Board 12V").Raw, 0u) << "held in reset";
    EXPECT_EQ(reset(SAHPI_WARM_RESET), SA_ERR_HPI_INVALID_REQUEST);
    ASSERT_EQ(reset(SAHPI_RESET_DEASSERT), SA_OK);
    EXPECT_EQ(resetState(), SAHPI_RESET_DEASSERT);
    EXPECT_EQ(reset(SAHPI_WARM_RESET), SA_OK);
    EXPECT_EQ(reset(static_cast<SaHpiResetActionT>(9)), SA_ERR_HPI_INVALID_PARAMS);

    // The fan-speed control drives every fan of the tray.
    ASSERT_EQ(setControl(TRAY, "Fan speed", ctrlState(SAHPI_CTRL_TYPE_ANALOG, 20)), SA_OK);
    for (const char *id : {"Fan 1 speed", "Fan 2 speed", "Fan 3 speed"}) {
        EXPECT_EQ(reading(TRAY, id).Raw, 32u) << id;
        EXPECT_EQ(reading(TRAY, id).EventStatus.EventStatus, SAHPI_ES_LOWER_MINOR) << id;
    }
    ASSERT_EQ(setControl(TRAY, "Fan speed", ctrlState(SAHPI_CTRL_TYPE_ANALOG, 60)), SA_OK);
    EXPECT_EQ(reading(TRAY, "Fan 2 speed").EventStatus.EventStatus, 0);

    // Inhibiting the supply turns its output off; its status is a discrete sensor.
    auto inhibit = [](SaHpiCtrlStateDigitalT D) { return ctrlState(SAHPI_CTRL_TYPE_DIGITAL, D); };
    ASSERT_EQ(setControl(PSU, "Power inhibit", inhibit(SAHPI_CTRL_STATE_ON)), SA_OK);
    EXPECT_EQ(reading(PSU, "Output 12V").Raw, 0u);
    EXPECT_EQ(reading(PSU, "Supply status").EventStatus.EventStatus, SAHPI_ES_POWER_OFF);
    EXPECT_EQ(reading(PSU, "Supply status").ValuesPresent, SAHPI_SRF_EVENT_STATE);
    ASSERT_EQ(setControl(PSU, "Power inhibit", inhibit(SAHPI_CTRL_STATE_OFF)), SA_OK);
    EXPECT_EQ(reading(PSU, "Supply status").EventStatus.EventStatus, SAHPI_ES_RUNNING);
}

TEST_F(SimulatorTest, ThresholdsAreReadWrittenAndKeptInOrder)
{
    const SaHpiSensorThresholdsT initial = thresholds(BOARD1, "Board 3.3V");
    EXPECT_EQ(initial.LowCritical.Raw, 149u);
    EXPECT_NEAR(initial.LowCritical.Interpreted.Value.SensorFloat32, 2.98, 1e-4);
    EXPECT_EQ(initial.UpMinor.ValuesPresent, SAHPI_SRF_RAW | SAHPI_SRF_INTERPRETED);
    EXPECT_EQ(thresholds(BOARD1, "CPU temperature").LowMinor.ValuesPresent, 0) << "no low limits";

    // Written as an interpreted value, seen by the next get and the next reading.
    SaHpiSensorThresholdsT t{};
    t.UpMinor = interpreted(SAHPI_SENSOR_INTERPRETED_TYPE_FLOAT32, 3.2f);
    ASSERT_EQ(setThresholds(BOARD1, "Board 3.3V", t), SA_OK);
    EXPECT_EQ(thresholds(BOARD1, "Board 3.3V").UpMinor.Raw, 160u);
    EXPECT_EQ(thresholds(BOARD1, "Board 3.3V").LowMinor.Raw, 157u) << "untouched";
    EXPECT_EQ(reading(BOARD1, "Board 3.3V").EventStatus.EventStatus, SAHPI_ES_UPPER_MINOR);
    // Writing back what was read is fine even for the fixed limits.
    ASSERT_EQ(setThresholds(BOARD1, "Board 3.3V", initial), SA_OK);
    EXPECT_EQ(reading(BOARD1, "Board 3.3V").EventStatus.EventStatus, 0);

    using T = SaHpiSensorThresholdsT;
    const struct {
        const char *what;
        SaHpiSensorReadingT T::*field;
        SaHpiSensorReadingT value;
        SaErrorT rc;
    } cases[] = {
        {"a fixed limit moved", &T::UpCritical, rawReading(200), SA_ERR_HPI_INVALID_CMD},
        {"low minor above up minor", &T::LowMinor, rawReading(173), SA_ERR_HPI_INVALID_DATA},
        {"up major below up minor", &T::UpMajor, rawReading(170), SA_ERR_HPI_INVALID_DATA},
        {"raw out of range", &T::UpMajor, rawReading(300), SA_ERR_HPI_INVALID_DATA},
        {"an event state only", &T::LowMinor, rawReading(0, SAHPI_SRF_EVENT_STATE),
         SA_ERR_HPI_INVALID_PARAMS},
    };
    for (const auto &c : cases) {
        T bad{};
        bad.*c.field = c.value;
        EXPECT_EQ(setThresholds(BOARD1, "Board 3.3V", bad), c.rc) << c.what;
    }
    const T after = thresholds(BOARD1, "Board 3.3V");
    EXPECT_EQ(memcmp(&after, &initial, sizeof(initial)), 0) << "a refused set changes nothing";
    EXPECT_EQ(setThresholds(CHASSIS, "Chassis intrusion", t), SA_ERR_HPI_INVALID_CMD);
}

TEST_F(SimulatorTest, EnabledStateChangesAreLoggedAndActiveAlarmsTranslated)
{
    Record &r = rec(BOARD1, "Board 12V");
    auto enable = [&](SaHpiSensorEvtEnablesT E) {
        return r.Fn.SensorEventEnablesSet(DOMAIN, rid(BOARD1), 0, &E, &r.Rdr, 0, r.UserData);
    };
    auto enables = [&] {
        return got<SaHpiSensorEvtEnablesT>([&](auto *Out) {
            return r.Fn.SensorEventEnablesGet(DOMAIN, rid(BOARD1), 0, r.UserData, 0, 0, Out);
        });
    };
    // Enables are the sensor's own and refuse states it never reports.
    const SaHpiSensorEvtEnablesT initial = enables();
    const SaHpiSensorStatusT scan = SAHPI_SENSTAT_SCAN_ENABLED;
    ASSERT_EQ(enable({scan, SAHPI_ES_UPPER_CRIT, 0}), SA_OK);
    const SaHpiSensorEvtEnablesT now = enables();
    EXPECT_EQ(now.SensorStatus, scan);
    EXPECT_EQ(now.AssertEvents, SAHPI_ES_UPPER_CRIT);
    EXPECT_EQ(now.DeassertEvents, 0);
    EXPECT_EQ(enable({scan, 0x40, 0}), SA_ERR_HPI_INVALID_DATA) << "a state it never reports";
    EXPECT_EQ(enable({0x01, 0, 0}), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(enable(initial), SA_OK);
    EXPECT_EQ(enables().SensorStatus, scan | SAHPI_SENSTAT_EVENTS_ENABLED);

    clearLog(BOARD1);
    const SaHpiSensorNumT num = r.Rdr.RdrTypeUnion.SensorRec.Num;
    SaHpiEventT alarm{};
    auto translate = [&] {
        return r.Fn.ActiveAlarmTranslate(DOMAIN, rid(BOARD1), num, r.UserData, &r.Rdr, nullptr,
                                         &alarm);
    };
    EXPECT_EQ(translate(), SA_ERR_HPI_NOT_PRESENT) << "a quiet sensor is no alarm";
    const SaHpiSensorThresholdsT limits = thresholds(BOARD1, "Board 12V");
    SaHpiSensorThresholdsT t{};
    t.UpMinor = rawReading(195);
    ASSERT_EQ(setThresholds(BOARD1, "Board 12V", t), SA_OK);
    ASSERT_EQ(translate(), SA_OK);
    EXPECT_EQ(alarm.Source, rid(BOARD1));
    EXPECT_EQ(alarm.Severity, SAHPI_MINOR);
    EXPECT_EQ(alarm.EventDataUnion.SensorEvent.EventState, SAHPI_ES_UPPER_MINOR);

    ASSERT_EQ(setThresholds(BOARD1, "Board 12V", limits), SA_OK);
    std::vector<SaHpiSelEntryT> log = logEntries(BOARD1);
    ASSERT_EQ(log.size(), 2u);
    for (size_t i = 0; i < 2; i++) {
        const SaHpiSensorEventT &e = log[i].Event.EventDataUnion.SensorEvent;
        EXPECT_EQ(e.SensorNum, num);
        EXPECT_EQ(e.EventState, SAHPI_ES_UPPER_MINOR);
        EXPECT_EQ(e.Assertion, i == 0 ? SAHPI_TRUE : SAHPI_FALSE);
        EXPECT_EQ(e.TriggerReading.Raw, 200u);
        EXPECT_EQ(e.TriggerThreshold.Raw, i == 0 ? 195u : 207u);
    }
    // The entry names its sensor's record and its resource.
    SaHpiSelEntryIdT prev = 0, next = 0;
    SaHpiSelEntryT entry{};
    SaHpiRdrT rdr{};
    SaHpiRptEntryT rpt{};
    ASSERT_EQ(entryGet(BOARD1, SAHPI_NEWEST_ENTRY, &entry, &prev, &next, &rdr, &rpt), SA_OK);
    EXPECT_EQ(textOf(rdr.IdString), "Board 12V");
    EXPECT_EQ(rpt.ResourceId, rid(BOARD1));

    // Disabled events are not logged.
    ASSERT_EQ(enable({scan, 0x3F, 0x3F}), SA_OK);
    ASSERT_EQ(setThresholds(BOARD1, "Board 12V", t), SA_OK);
    ASSERT_EQ(setThresholds(BOARD1, "Board 12V", limits), SA_OK);
    EXPECT_EQ(logEntries(BOARD1).size(), 2u);
    ASSERT_EQ(enable(initial), SA_OK);
}

// ---- Controls ----

TEST_F(SimulatorTest, ControlsOfEveryTypeKeepWhatIsSet)
{
    auto digital = [](int D) { return ctrlState(SAHPI_CTRL_TYPE_DIGITAL, D); };
    EXPECT_EQ(control(CHASSIS, "Alarm LED").StateUnion.Digital, SAHPI_CTRL_STATE_OFF) << "default";
    const struct {
        const char *id;
        SaHpiCtrlStateT good, bad;
        SaErrorT rc;
    } cases[] = {
        {"Alarm LED", digital(SAHPI_CTRL_STATE_ON), digital(4), SA_ERR_HPI_INVALID_PARAMS},
        {"Operating mode", ctrlState(SAHPI_CTRL_TYPE_DISCRETE, 7u),
         ctrlState(SAHPI_CTRL_TYPE_ANALOG, 7), SA_ERR_HPI_INVALID_DATA},
        {"Display brightness", ctrlState(SAHPI_CTRL_TYPE_ANALOG, 100),
         ctrlState(SAHPI_CTRL_TYPE_ANALOG, 101), SA_ERR_HPI_DATA_EX_LIMITS},
        {"Buzzer pattern",
         ctrlState(SAHPI_CTRL_TYPE_STREAM, SaHpiCtrlStateStreamT{SAHPI_TRUE, 4, {9, 8, 7, 6}}),
         ctrlState(SAHPI_CTRL_TYPE_STREAM, SaHpiCtrlStateStreamT{SAHPI_TRUE, 5, {}}),
         SA_ERR_HPI_INVALID_PARAMS},
        {"OEM settings", ctrlState(SAHPI_CTRL_TYPE_OEM, SaHpiCtrlStateOemT{42, 2, {0, 0x77}}),
         ctrlState(SAHPI_CTRL_TYPE_ANALOG, 0), SA_ERR_HPI_INVALID_DATA},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.id);
        ASSERT_EQ(setControl(CHASSIS, c.id, c.good), SA_OK);
        SaHpiCtrlStateT now = control(CHASSIS, c.id);
        EXPECT_EQ(memcmp(&now, &c.good, sizeof(now)), 0) << "the next get sees the set";
        EXPECT_EQ(setControl(CHASSIS, c.id, c.bad), c.rc);
        now = control(CHASSIS, c.id);
        EXPECT_EQ(memcmp(&now, &c.good, sizeof(now)), 0) << "a refused set changes nothing";
    }
    // A pulse needs the opposite state and ends where it began.
    ASSERT_EQ(setControl(CHASSIS, "Alarm LED", digital(SAHPI_CTRL_STATE_OFF)), SA_OK);
    EXPECT_EQ(setControl(CHASSIS, "Alarm LED", digital(SAHPI_CTRL_STATE_PULSE_OFF)),
              SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(setControl(CHASSIS, "Alarm LED", digital(SAHPI_CTRL_STATE_PULSE_ON)), SA_OK);
    EXPECT_EQ(control(CHASSIS, "Alarm LED").StateUnion.Digital, SAHPI_CTRL_STATE_OFF);
}

TEST_F(SimulatorTest, TextControlIsADisplayOfLines)
{
    const std::string panel = "Front panel display";
    auto text = [&](SaHpiTxtLineNumT Line) {
        return textOf(control(CHASSIS, panel, Line).StateUnion.Text.Text);
    };
    auto write = [&](SaHpiTxtLineNumT Line, Str Text, int Language = SAHPI_LANG_ENGLISH) {
        SaHpiCtrlStateT s = ctrlState(SAHPI_CTRL_TYPE_TEXT, SaHpiCtrlStateTextT{Line, {}});
        s.StateUnion.Text.Text = textBuffer(Text);
        s.StateUnion.Text.Text.Language = static_cast<SaHpiLanguageT>(Language);
        return setControl(CHASSIS, panel, s);
    };
    EXPECT_EQ(text(SAHPI_TLN_ALL_LINES), "Kvi simulator   shelf ready");
    ASSERT_EQ(write(2, "fan fault"), SA_OK);
    EXPECT_EQ(text(1), "Kvi simulator   ");
    EXPECT_EQ(text(2), "fan fault");
    EXPECT_EQ(text(SAHPI_TLN_ALL_LINES), "Kvi simulator   fan fault");
    // A long text written from line 1 wraps onto line 2; all lines at once
    // clears what it does not cover.
    ASSERT_EQ(write(1, "0123456789abcdefXY"), SA_OK);
    EXPECT_EQ(text(2), "XY");
    ASSERT_EQ(write(SAHPI_TLN_ALL_LINES, "ok"), SA_OK);
    EXPECT_EQ(text(SAHPI_TLN_ALL_LINES), "ok");
    EXPECT_EQ(text(2), "");

    EXPECT_EQ(write(3, "xx"), SA_ERR_HPI_DATA_EX_LIMITS) << "line 3";
    EXPECT_EQ(write(1, "xx", SAHPI_LANG_FRENCH), SA_ERR_HPI_DATA_EX_LIMITS);
    EXPECT_EQ(write(1, "xx", 137), SA_ERR_HPI_INVALID_PARAMS) << "no such language";
    EXPECT_EQ(write(0, std::string(33, 'x')), SA_ERR_HPI_DATA_EX_LIMITS) << "longer than shown";
    EXPECT_EQ(text(SAHPI_TLN_ALL_LINES), "ok");
}

// ---- Inventory ----

TEST_F(SimulatorTest, InventoryIsLaidOutInTheCallersBuffer)
{
    std::vector<uint64_t> buffer(2);
    SaHpiUint32T actual = 0;
    readInventory(CHASSIS, buffer, &actual, SA_ERR_HPI_DATA_LEN_INVALID);
    EXPECT_GT(actual, sizeof(SaHpiInventoryDataT));
    EXPECT_EQ(reinterpret_cast<SaHpiInventoryDataT *>(buffer.data())->Validity,
              SAHPI_INVENT_DATA_OVERFLOW);

    buffer.assign((actual + 7) / 8, 0);
    auto records = readInventory(CHASSIS, buffer, &actual);
    ASSERT_EQ(records.size(), 2u);
    EXPECT_EQ(records[0]->RecordData.ChassisInfo.Type, SAHPI_INVENT_CTYP_RACKMOUNT);
    const SaHpiInventGeneralDataT &g = records[0]->RecordData.ChassisInfo.GeneralData;
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

    buffer.assign(1024, 0);
    records = readInventory(BOARD2, buffer, &actual);
    ASSERT_EQ(records.size(), 3u);
    EXPECT_EQ(textOf(*records[0]->RecordData.BoardInfo.SerialNumber), "SIM-PB-0002");
    EXPECT_EQ(records[2]->RecordType, SAHPI_INVENT_RECTYPE_INTERNAL_USE);
    EXPECT_EQ(records[2]->DataLength, 4u);
    EXPECT_EQ(records[2]->RecordData.InternalUse.Data[0], 0x01);
}

TEST_F(SimulatorTest, InventoryWrittenIsReadBack)
{
    // A product area with two custom fields, and an OEM area, laid out the
    // way a client lays them out: lists running on past their declared end.
    SaHpiTextBufferT name = textBuffer("Replaced supply");
    SaHpiTextBufferT c1 = textBuffer("first"), c2 = textBuffer("second");
    alignas(8) char productBytes[sizeof(SaHpiInventDataRecordT) + 3 * sizeof(void *)] = {};
    auto *product = reinterpret_cast<SaHpiInventDataRecordT *>(productBytes);
    product->RecordType = SAHPI_INVENT_RECTYPE_PRODUCT_INFO;
    product->RecordData.ProductInfo.MfgDateTime = SAHPI_TIME_UNSPECIFIED;
    product->RecordData.ProductInfo.ProductName = &name;
    customList(&product->RecordData.ProductInfo)[0] = &c1;
    customList(&product->RecordData.ProductInfo)[1] = &c2;
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
    recordList(data)[0] = product;
    recordList(data)[1] = oem;
    Record &inv = rec(PSU, "Inventory");
    auto write = [&] { return inv.Fn.EntityInventoryDataWrite(DOMAIN, 0, 0, data, inv.UserData); };
    ASSERT_EQ(write(), SA_OK);

    std::vector<uint64_t> buffer(1024);
    SaHpiUint32T actual = 0, again = 0;
    auto records = readInventory(PSU, buffer, &actual);
    ASSERT_EQ(records.size(), 2u);
    const SaHpiInventGeneralDataT &p = records[0]->RecordData.ProductInfo;
    EXPECT_EQ(textOf(*p.ProductName), "Replaced supply");
    EXPECT_EQ(p.Manufacturer, nullptr);
    ASSERT_NE(customList(&p)[1], nullptr);
    EXPECT_EQ(textOf(*customList(&p)[1]), "second");
    EXPECT_EQ(customList(&p)[2], nullptr);
    EXPECT_EQ(records[1]->RecordData.OemData.MId, 99u);
    EXPECT_EQ(records[1]->DataLength, oem->DataLength);
    EXPECT_EQ(records[1]->RecordData.OemData.Data[0], 0x0a);

    // A record of an unknown type is refused and changes nothing.
    oem->RecordType = static_cast<SaHpiInventDataRecordTypeT>(0xB7);
    EXPECT_EQ(write(), SA_ERR_HPI_INVALID_PARAMS);
    readInventory(PSU, buffer, &again);
    EXPECT_EQ(again, actual);

    // Parameter control brings the manufacturer's inventory back.
    ASSERT_EQ(inv.Fn.RdrDefaultParmControl(DOMAIN, 0, nullptr, nullptr, inv.UserData), SA_OK);
    records = readInventory(PSU, buffer, &actual);
    ASSERT_FALSE(records.empty());
    EXPECT_EQ(textOf(*records[0]->RecordData.ProductInfo.ProductName), "Power supply");
}

// ---- Watchdog ----

TEST_F(SimulatorTest, WatchdogCountsDownAndActsOnExpiry)
{
    Record &w = rec(BOARD1, "Watchdog");
    const SaHpiWatchdogNumT num = w.Rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
    auto get = [&] {
        return got<SaHpiWatchdogT>(
            [&](auto *Out) { return w.Fn.WatchdogTimerGet(DOMAIN, 0, num, w.UserData, Out); });
    };
    auto set = [&](SaHpiWatchdogT In) {
        return w.Fn.WatchdogTimerSet(DOMAIN, 0, num, &In, w.UserData);
    };
    auto reset = [&] { return w.Fn.WatchdogTimerReset(DOMAIN, 0, num, w.UserData); };
    auto waitForExpiry = [&] {
        auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(5);
        while (get().Running && std::chrono::steady_clock::now() < deadline)
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        return get();
    };
    clearLog(BOARD1);
    EXPECT_EQ(get().PresentCount, 10000u);

    // Running asked for, but a stopped timer is not started by a set.
    ASSERT_EQ(set(timer(SAHPI_WA_RESET, SAHPI_WPI_NMI, 150, 400)), SA_OK);
    EXPECT_FALSE(get().Running);
    EXPECT_EQ(get().PresentCount, 400u);
    ASSERT_EQ(reset(), SA_OK);
    SaHpiWatchdogT running = get();
    EXPECT_TRUE(running.Running);
    std::this_thread::sleep_for(std::chrono::milliseconds(100));
    EXPECT_LT(get().PresentCount, running.PresentCount) << "it counts down";

    SaHpiWatchdogT expired = waitForExpiry();
    ASSERT_FALSE(expired.Running);
    EXPECT_EQ(expired.PresentCount, 0u);
    EXPECT_EQ(expired.TimerUseExpFlags, SAHPI_WATCHDOG_EXP_OS_LOAD);
    std::vector<SaHpiWatchdogActionEventT> actions;
    for (const SaHpiSelEntryT &e : logEntries(BOARD1)) {
        ASSERT_EQ(e.Event.EventType, SAHPI_ET_WATCHDOG);
        actions.push_back(e.Event.EventDataUnion.WatchdogEvent.WatchdogAction);
        EXPECT_EQ(e.Event.EventDataUnion.WatchdogEvent.WatchdogNum, num);
    }
    EXPECT_EQ(actions,
              (std::vector<SaHpiWatchdogActionEventT>{SAHPI_WAE_TIMER_INT, SAHPI_WAE_RESET}));

    ASSERT_EQ(set(timer(SAHPI_WA_POWER_DOWN, SAHPI_WPI_NONE, 0, 50)), SA_OK);
    ASSERT_EQ(reset(), SA_OK);
    EXPECT_FALSE(waitForExpiry().Running);
    EXPECT_EQ(powerState(BOARD1), SAHPI_HS_POWER_OFF) << "the expiry powered the board down";
    ASSERT_EQ(power(BOARD1, SAHPI_HS_POWER_ON), SA_OK);

    // Once the pre-timeout fired, only the expiry ends the countdown.
    ASSERT_EQ(set(timer(SAHPI_WA_POWER_DOWN, SAHPI_WPI_SMI, 2000, 2000)), SA_OK);
    ASSERT_EQ(reset(), SA_OK);
    auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(2);
    SaErrorT rc = SA_OK;
    while ((rc = reset()) == SA_OK && std::chrono::steady_clock::now() < deadline)
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_EQ(rc, SA_ERR_HPI_INVALID_REQUEST);

    // A set that keeps it running restarts it and clears the flags written
    // as 1; one that stops it stops it.
    SaHpiWatchdogT config = timer(SAHPI_WA_POWER_DOWN, SAHPI_WPI_SMI, 0, 60000);
    config.TimerUseExpFlags = SAHPI_WATCHDOG_EXP_OS_LOAD;
    ASSERT_EQ(set(config), SA_OK);
    EXPECT_TRUE(get().Running);
    EXPECT_GT(get().PresentCount, 50000u);
    EXPECT_EQ(get().TimerUseExpFlags, 0);
    config.Running = SAHPI_FALSE;
    ASSERT_EQ(set(config), SA_OK);
    EXPECT_FALSE(get().Running);

    SaHpiWatchdogT bad[3] = {config, config, config};
    bad[0].PreTimeoutInterval = config.InitialCount + 1;
    bad[1].TimerAction = static_cast<SaHpiWatchdogActionT>(7);
    bad[2].TimerUse = static_cast<SaHpiWatchdogTimerUseT>(9);
    EXPECT_EQ(set(bad[0]), SA_ERR_HPI_INVALID_DATA);
    EXPECT_EQ(set(bad[1]), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(set(bad[2]), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(w.Fn.RdrDefaultParmControl(DOMAIN, 0, nullptr, nullptr, w.UserData), SA_OK);
    EXPECT_EQ(get().InitialCount, 10000u);
}

// ---- Event log ----

TEST_F(SimulatorTest, EventLogAddsGetsDeletesClearsAndWraps)
{
    Resource &r = res(TRAY);
    void *u = r.UserDefined;
    auto info = [&] {
        return got<SaHpiSelInfoT>(
            [&](auto *Out) { return r.Fn.EventLogInfoGet(DOMAIN, 0, u, Out); });
    };
    auto add = [&](SaHpiUint8T Mark, SaHpiEventTypeT Type = SAHPI_ET_USER) {
        SaHpiSelEntryT e{};
        e.Event.EventType = Type;
        e.Event.Severity = SAHPI_INFORMATIONAL;
        e.Event.EventDataUnion.UserEvent.UserEventData[0] = Mark;
        return r.Fn.EventLogEntryAdd(DOMAIN, 0, &e, u);
    };
    auto marks = [&] {
        std::vector<int> out;
        for (const SaHpiSelEntryT &e : logEntries(TRAY))
            out.push_back(e.Event.EventDataUnion.UserEvent.UserEventData[0]);
        return out;
    };
    clearLog(TRAY);
    SaHpiSelInfoT i = info();
    EXPECT_EQ(i.Entries, 0u);
    EXPECT_EQ(i.Size, 4u);
    EXPECT_TRUE(i.DeleteEntrySupported);
    SaHpiSelEntryIdT prev = 0, next = 0;
    SaHpiSelEntryT entry{};
    EXPECT_EQ(entryGet(TRAY, SAHPI_OLDEST_ENTRY, &entry, &prev, &next), SA_ERR_HPI_NOT_PRESENT);

    for (SaHpiUint8T m : {1, 2, 3})
        ASSERT_EQ(add(m), SA_OK);
    std::vector<SaHpiSelEntryT> entries = logEntries(TRAY);
    ASSERT_EQ(entries.size(), 3u);
    EXPECT_EQ(marks(), (std::vector<int>{1, 2, 3}));
    ASSERT_EQ(entryGet(TRAY, SAHPI_NEWEST_ENTRY, &entry, &prev, &next), SA_OK);
    EXPECT_EQ(entry.EntryId, entries[2].EntryId);
    EXPECT_EQ(prev, entries[1].EntryId);

    ASSERT_EQ(r.Fn.EventLogEntryDelete(DOMAIN, 0, entries[1].EntryId, u), SA_OK);
    EXPECT_EQ(marks(), (std::vector<int>{1, 3}));
    EXPECT_EQ(r.Fn.EventLogEntryDelete(DOMAIN, 0, entries[1].EntryId, u), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(entryGet(TRAY, entries[1].EntryId, &entry, &prev, &next), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(entryGet(TRAY, SAHPI_NO_MORE_ENTRIES, &entry, &prev, &next),
              SA_ERR_HPI_INVALID_PARAMS);

    // Full: the oldest goes, ids are not reused.
    for (SaHpiUint8T m : {4, 5, 6})
        ASSERT_EQ(add(m), SA_OK);
    EXPECT_EQ(marks(), (std::vector<int>{3, 4, 5, 6}));
    EXPECT_TRUE(info().OverflowFlag);
    EXPECT_GT(logEntries(TRAY).back().EntryId, entries[2].EntryId);
    clearLog(TRAY);
    i = info();
    EXPECT_EQ(i.Entries, 0u);
    EXPECT_FALSE(i.OverflowFlag);
    EXPECT_EQ(add(7, static_cast<SaHpiEventTypeT>(5)), SA_ERR_HPI_INVALID_PARAMS);
}

TEST_F(SimulatorTest, EventLogClockAndStateAreTheLogsOwn)
{
    Resource &r = res(PSU);
    void *u = r.UserDefined;
    SaHpiTimeT now = 0;
    ASSERT_EQ(kviCsGetSaHpiTime(&now), SA_OK);
    const SaHpiTimeT hour = 3600LL * 1000000000LL;
    ASSERT_EQ(r.Fn.EventLogTimeSet(DOMAIN, 0, now + hour, u), SA_OK);
    SaHpiTimeT logTime =
        got<SaHpiTimeT>([&](auto *Out) { return r.Fn.EventLogTimeGet(DOMAIN, 0, u, Out); });
    EXPECT_NEAR(static_cast<double>(logTime - now), static_cast<double>(hour), 1e9);
    EXPECT_EQ(r.Fn.EventLogTimeSet(DOMAIN, 0, SAHPI_TIME_UNSPECIFIED, u),
              SA_ERR_HPI_INVALID_PARAMS);

    // Disabled, the log takes clients' entries but not the resource's own.
    clearLog(PSU);
    ASSERT_EQ(r.Fn.EventLogStateSet(DOMAIN, 0, SAHPI_FALSE, u), SA_OK);
    EXPECT_FALSE(
        got<SaHpiBoolT>([&](auto *Out) { return r.Fn.EventLogStateGet(DOMAIN, 0, u, Out); }));
    ASSERT_EQ(power(PSU, SAHPI_HS_POWER_OFF), SA_OK);
    ASSERT_EQ(power(PSU, SAHPI_HS_POWER_ON), SA_OK);
    EXPECT_TRUE(logEntries(PSU).empty());
    SaHpiSelEntryT e{};
    e.Event.EventType = SAHPI_ET_USER;
    e.Event.Severity = SAHPI_OK;
    ASSERT_EQ(r.Fn.EventLogEntryAdd(DOMAIN, 0, &e, u), SA_OK);
    std::vector<SaHpiSelEntryT> entries = logEntries(PSU);
    ASSERT_EQ(entries.size(), 1u);
    EXPECT_NEAR(static_cast<double>(entries[0].Timestamp - now), static_cast<double>(hour), 5e9)
        << "stamped with the log's clock";
    EXPECT_EQ(r.Fn.EventLogStateSet(DOMAIN, 0, 2, u), SA_ERR_HPI_INVALID_PARAMS);

    // Enabled again, powering the supply off and on logs its status changes.
    ASSERT_EQ(r.Fn.EventLogStateSet(DOMAIN, 0, SAHPI_TRUE, u), SA_OK);
    for (auto [state, logged] : {std::pair{SAHPI_HS_POWER_OFF, SAHPI_ES_POWER_OFF},
                                 std::pair{SAHPI_HS_POWER_ON, SAHPI_ES_RUNNING}}) {
        clearLog(PSU);
        ASSERT_EQ(power(PSU, state), SA_OK);
        SaHpiEventStateT asserted = 0;
        for (const SaHpiSelEntryT &x : logEntries(PSU)) {
            const SaHpiSensorEventT &s = x.Event.EventDataUnion.SensorEvent;
            if (x.Event.EventType == SAHPI_ET_SENSOR && s.SensorType == SAHPI_POWER_SUPPLY &&
                s.Assertion)
                asserted |= s.EventState;
        }
        EXPECT_EQ(asserted, logged);
    }
    ASSERT_EQ(r.Fn.EventLogTimeSet(DOMAIN, 0, now, u), SA_OK);
}

// ---- Parameter control ----

TEST_F(SimulatorTest, ResourceDefaultsPutTheLogStateAndHotSwapSettingsBack)
{
    Resource &r = res(BOARD2);
    void *u = r.UserDefined;
    EXPECT_EQ(r.Fn.AutoExtractTimeoutSet(DOMAIN, 0, -2, u), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(r.Fn.AutoExtractTimeoutSet(DOMAIN, 0, SAHPI_TIMEOUT_BLOCK, u), SA_OK);
    ASSERT_EQ(r.Fn.EventLogStateSet(DOMAIN, 0, SAHPI_FALSE, u), SA_OK);
    ASSERT_EQ(r.Fn.RptDefaultParmControl(DOMAIN, rid(BOARD2)), SA_OK);
    EXPECT_NE(
        got<SaHpiTimeoutT>([&](auto *O) { return r.Fn.AutoExtractTimeoutGet(DOMAIN, 0, u, O); }),
        SAHPI_TIMEOUT_BLOCK);
    EXPECT_TRUE(got<SaHpiBoolT>([&](auto *O) { return r.Fn.EventLogStateGet(DOMAIN, 0, u, O); }));
    EXPECT_EQ(r.Fn.RptDefaultParmControl(DOMAIN, 999), SA_ERR_HPI_INVALID_RESOURCE);
}

TEST_F(SimulatorTest, SensorDefaultsPutTheThresholdsBack)
{
    Record &cpu = rec(BOARD2, "CPU temperature");
    SaHpiSensorThresholdsT t{};
    t.UpMinor = rawReading(50);
    ASSERT_EQ(setThresholds(BOARD2, "CPU temperature", t), SA_OK);
    ASSERT_EQ(cpu.Fn.RdrDefaultParmControl(DOMAIN, 0, nullptr, nullptr, cpu.UserData), SA_OK);
    EXPECT_EQ(thresholds(BOARD2, "CPU temperature").UpMinor.Raw, 70u);
}

// ---- Unloading (last: it loads the shelf again under new ids) ----

TEST_F(SimulatorTest, UnloadingRemovesTheShelfAndFreesItsMemory)
{
    // A running watchdog must not keep the plug-in's thread busy past its end.
    Record &w = rec(BOARD2, "Watchdog");
    SaHpiWatchdogT config = timer(SAHPI_WA_RESET, SAHPI_WPI_NONE, 0, 100000);
    ASSERT_EQ(w.Fn.WatchdogTimerSet(DOMAIN, 0, 0, &config, w.UserData), SA_OK);
    ASSERT_EQ(w.Fn.WatchdogTimerReset(DOMAIN, 0, 0, w.UserData), SA_OK);

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
    EXPECT_EQ(shelf_.Order, (std::vector<SaHpiResourceIdT>{10, 6, 7, 8, 9}));
}

} // namespace
