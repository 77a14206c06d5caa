// The simulator's events as a subscriber receives them from the library's
// queue: the library initialized as the daemon does it, the shelf discovered,
// readings driven through the plug-in's own hook.
#include <dlfcn.h>

#include <gtest/gtest.h>

#include "KviDaemonCore.h"
#include "SimulatorTestSupport.h"
#include "core/SaHpi/events/EventManager.h"
#include "plugins/simulator/KviSimulator.h"
#include "support/KviTestSupport.h"

namespace
{

class SimulatorEventsTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        dir_ = new KviTempDir;
        const std::string config = "mapl_modules = \"" + simulatorPath() +
                                   "\"\nKviSimProcessorBoards = \"2\"\nKviNvStorageDir = \"" +
                                   dir_->path() + "\"\n";
        SaHpiVersionT version = 0;
        SaHpiSessionIdT session = 0;
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_->write("sim.conf", config).c_str()), SA_OK);
        ASSERT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
        ASSERT_EQ(saHpiInitialize(&version), SA_OK);
        ASSERT_EQ(saHpiSessionOpen(DOMAIN, &session, nullptr), SA_OK);
        ASSERT_EQ(saHpiResourcesDiscover(session), SA_OK);
        shelf_ = walkShelf();
        void *plugin = dlopen(simulatorPath().c_str(), RTLD_NOW | RTLD_NOLOAD);
        ASSERT_NE(plugin, nullptr);
        drive_ = reinterpret_cast<KviSimSensorReadingDriveT>(
            dlsym(plugin, KVI_SIM_SENSOR_READING_DRIVE));
        dlclose(plugin); // the library still holds it
        ASSERT_NE(drive_, nullptr);
    }
    static void TearDownTestSuite()
    {
        EXPECT_EQ(saHpiFinalize(), SA_OK);
        delete dir_;
    }
    void SetUp() override { session_ = subscriber(); }
    void TearDown() override { kviCsSessionClose(session_); }

    static SaHpiSessionIdT subscriber(SaHpiBoolT Alarms = SAHPI_FALSE)
    {
        SaHpiSessionIdT s = 0;
        SaHpiUint32T at = 0;
        EXPECT_EQ(kviCsSessionOpen(DOMAIN, &s), SA_OK);
        EXPECT_EQ(kviCsSubscribe(s, Alarms, &at), SA_OK);
        return s;
    }
    static SaErrorT next(SaHpiSessionIdT S, SaHpiEventT *E, SaHpiTimeoutT T = 0)
    {
        SaHpiUint32T n = 0;
        return kviCsGetEvent(S, T, E, &n);
    }
    static const Record &board12V(const std::string &Board)
    {
        for (const Record &r : shelf_.ByTag.at(Board).Records)
            if (textOf(r.Rdr.IdString) == "Board 12V")
                return r;
        ADD_FAILURE() << "no Board 12V on " << Board;
        return shelf_.ByTag.at(Board).Records.front();
    }
    static SaErrorT drive(const std::string &Board, SaHpiBoolT On, SaHpiUint32T Raw = 0)
    {
        return drive_(shelf_.ByTag.at(Board).Entry.ResourceId,
                      board12V(Board).Rdr.RdrTypeUnion.SensorRec.Num, On, Raw);
    }

    inline static KviTempDir *dir_ = nullptr;
    inline static Shelf shelf_;
    inline static KviSimSensorReadingDriveT drive_ = nullptr;
    SaHpiSessionIdT session_ = 0;
};

const std::string BOARD1 = "Processor board 1", BOARD2 = "Processor board 2";

TEST_F(SimulatorEventsTest, DrivenReadingPostsCrossingsBothWaysPastTheHysteresis)
{
    // Board 12V: upper minor limit 207, hysteresis 1, nominal 200.
    struct Step {
        SaHpiUint32T raw;
        bool posts;
        SaHpiBoolT assertion;
    } steps[] = {
        {208, true, SAHPI_TRUE}, {207, false, 0}, {206, true, SAHPI_FALSE}, {200, false, 0}};
    for (const Step &s : steps) {
        SCOPED_TRACE(s.raw);
        ASSERT_EQ(drive(BOARD1, SAHPI_TRUE, s.raw), SA_OK);
        SaHpiEventT e{};
        ASSERT_EQ(next(session_, &e), s.posts ? SA_OK : SA_ERR_HPI_TIMEOUT);
        if (!s.posts)
            continue;
        const SaHpiSensorEventT &se = e.EventDataUnion.SensorEvent;
        EXPECT_EQ(e.EventType, SAHPI_ET_SENSOR);
        EXPECT_EQ(e.Source, shelf_.ByTag.at(BOARD1).Entry.ResourceId);
        EXPECT_EQ(se.SensorNum, board12V(BOARD1).Rdr.RdrTypeUnion.SensorRec.Num);
        EXPECT_EQ(se.EventState, SAHPI_ES_UPPER_MINOR);
        EXPECT_EQ(se.Assertion, s.assertion);
        EXPECT_EQ(se.TriggerReading.Raw, s.raw);
    }
    EXPECT_EQ(drive(BOARD1, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(drive(BOARD1, 2), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(drive_(0xFFFFFFF0u, 1, SAHPI_TRUE, 0), SA_ERR_HPI_INVALID_RESOURCE);
}

TEST_F(SimulatorEventsTest, ActiveAlarmsGoToTheirSubscriberAloneButForTheFirst)
{
    ASSERT_EQ(drive(BOARD1, SAHPI_TRUE, 230), SA_OK);
    ASSERT_EQ(drive(BOARD2, SAHPI_TRUE, 230), SA_OK);
    SaHpiEventT e{};
    SaHpiUint32T lastCrossing = 0;
    while (kviCsGetEvent(session_, 0, &e, &lastCrossing) == SA_OK) {
    }

    const SaHpiSessionIdT alarmed = subscriber(SAHPI_TRUE);
    SaHpiUint32T first = 0, last = 0;
    ASSERT_EQ(kviCsGetSessionLastEvent(alarmed, &first), SA_OK);
    EXPECT_GT(first, lastCrossing);
    EXPECT_EQ(next(session_, &e), SA_ERR_HPI_TIMEOUT) << "not for other sessions";
    ASSERT_EQ(kviCsGetSessionLastEvent(session_, &last), SA_OK); // skipped up to the last alarm
    int delivered = 0;
    while (next(alarmed, &e) == SA_OK) {
        delivered++;
        EXPECT_EQ(e.EventType, SAHPI_ET_SENSOR);
        EXPECT_EQ(e.EventDataUnion.SensorEvent.Assertion, SAHPI_TRUE);
    }
    EXPECT_GE(last - first + 1, 2u) << "both boards are in alarm";
    EXPECT_EQ(delivered, static_cast<int>(last - first));
    kviCsSessionClose(alarmed);
    ASSERT_EQ(drive(BOARD1, SAHPI_FALSE), SA_OK);
    ASSERT_EQ(drive(BOARD2, SAHPI_FALSE), SA_OK);
}

TEST_F(SimulatorEventsTest, WatchdogExpiryAndLogAdditionsPostTheirEvents)
{
    const Resource &board = shelf_.ByTag.at(BOARD1);
    const Record *w = nullptr;
    for (const Record &r : board.Records)
        w = r.Rdr.RdrType == SAHPI_WATCHDOG_RDR ? &r : w;
    ASSERT_NE(w, nullptr);
    SaHpiWatchdogT timer{};
    timer.Log = timer.Running = SAHPI_TRUE;
    timer.TimerUse = SAHPI_WTU_OS_LOAD;
    timer.TimerAction = SAHPI_WA_RESET;
    timer.InitialCount = 50;
    const SaHpiWatchdogNumT num = w->Rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
    ASSERT_EQ(w->Fn.WatchdogTimerSet(DOMAIN, 0, num, &timer, w->UserData), SA_OK);
    ASSERT_EQ(w->Fn.WatchdogTimerReset(DOMAIN, 0, num, w->UserData), SA_OK);
    SaHpiEventT e{};
    ASSERT_EQ(next(session_, &e, 5000000000LL), SA_OK);
    EXPECT_EQ(e.EventType, SAHPI_ET_WATCHDOG);
    EXPECT_EQ(e.EventDataUnion.WatchdogEvent.WatchdogNum, num);
    EXPECT_EQ(e.EventDataUnion.WatchdogEvent.WatchdogAction, SAHPI_WAE_RESET);

    SaHpiSelEntryT entry{};
    entry.Event.EventType = SAHPI_ET_USER;
    entry.Event.Source = board.Entry.ResourceId;
    entry.Event.Severity = SAHPI_INFORMATIONAL;
    ASSERT_EQ(board.Fn.EventLogEntryAdd(DOMAIN, 0, &entry, board.UserDefined), SA_OK);
    while (next(session_, &e) == SA_OK && e.EventType != SAHPI_ET_USER) {
    }
    EXPECT_EQ(e.EventType, SAHPI_ET_USER);
}

} // namespace
