// The simulator under many clients at once: client threads call every kind of
// slot through the front end's frame (master lock, lookup, plug-in lock,
// slot) while the plug-in's countdown thread expires watchdogs into the
// event logs; then the plug-in is unloaded while watchdogs still run.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <random>
#include <thread>
#include <vector>

#include "KviDaemonCore.h"
#include "SimulatorTestSupport.h"
#include "kvi/KviMaplManager.h"
#include "support/KviTestSupport.h"

namespace
{

enum class Outcome { Done, Gone, Busy };

struct Target {
    SaHpiResourceIdT Rid;
    SaHpiEntryIdT RecordId; // SAHPI_FIRST_ENTRY: the resource itself
    SaHpiRdrTypeT Type;
};

// What the frame found for a target.
struct Found {
    KviDsRptFnTable Rpt;
    void *User;
    SaHpiRdrT Rdr;
    KviDsRdrFnTable Fn;
    void *Data;
};

// The frame of a redirected call: the entry is looked up under the master
// lock, the plug-in's lock is taken before the master lock is let go, and the
// slot runs under the plug-in's lock alone. Gone: the entry left the table.
template <typename Call> Outcome frame(const Target &T, Call call)
{
    KviCsRwLockT *master = nullptr;
    if (kviDsMaplManagerGetMaplMasterLock(&master) != SA_OK ||
        KVI_CS_RW_LOCK_RD_LOCK(master, 1000) != SA_OK)
        return Outcome::Busy;
    Found f{};
    SaHpiUint32T maplNum = 0;
    KviCsRwLockT *lock = nullptr;
    SaHpiBoolT active = SAHPI_FALSE;
    SaErrorT rc =
        kviCsRptActiveEntryGetByRid(DOMAIN, T.Rid, nullptr, &f.Rpt, &f.User, &maplNum, &lock);
    if (rc == SA_OK && T.RecordId != SAHPI_FIRST_ENTRY)
        rc = kviCsRdrGet(DOMAIN, T.Rid, SAHPI_NO_RECORD, T.RecordId, nullptr, &f.Rdr, &active,
                         &f.Data, &f.Fn, nullptr, nullptr);
    Outcome outcome = rc != SA_OK                                   ? Outcome::Gone
                      : KVI_CS_RW_LOCK_RD_LOCK(lock, 1000) != SA_OK ? Outcome::Busy
                                                                    : Outcome::Done;
    KVI_CS_DOA_RW_LOCK_RD_UNLOCK(master);
    if (outcome == Outcome::Done) {
        call(f);
        KVI_CS_DOA_RW_LOCK_RD_UNLOCK(lock);
    }
    return outcome;
}

// One client: random calls until told to stop. Every result must be one the
// simulator gives for such a call.
void client(const std::vector<Target> &Targets, unsigned Seed, const std::atomic<bool> &Stop,
            std::atomic<int> &Calls, std::atomic<int> &Failures)
{
    std::mt19937 random(Seed);
    auto expect = [&](bool Ok) { Failures += Ok ? 0 : 1; };
    while (!Stop) {
        const Target &t = Targets[random() % Targets.size()];
        const SaHpiDomainIdT d = DOMAIN;
        const SaHpiResourceIdT r = t.Rid;
        Outcome outcome = frame(t, [&](Found &F) {
            switch (t.Type) {
            case SAHPI_SENSOR_RDR: {
                SaHpiSensorReadingT reading{};
                expect(F.Fn.SensorReadingGet(d, r, 0, 0, &F.Rdr, F.Data, &reading) == SA_OK);
                SaHpiSensorThresholdsT limits{};
                if (F.Fn.SensorThresholdsGet(d, r, 0, &F.Rdr, F.Data, &limits) == SA_OK)
                    expect(F.Fn.SensorThresholdsSet(d, r, 0, &F.Rdr, &limits, F.Data) == SA_OK);
                SaHpiEventT event{};
                SaErrorT rc = F.Fn.ActiveAlarmTranslate(d, r, 0, F.Data, &F.Rdr, nullptr, &event);
                expect(rc == SA_OK || rc == SA_ERR_HPI_NOT_PRESENT);
                break;
            }
            case SAHPI_CTRL_RDR: {
                SaHpiCtrlStateT state{};
                state.Type = F.Rdr.RdrTypeUnion.CtrlRec.Type;
                state.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
                expect(F.Fn.ControlStateGet(d, r, 0, F.Data, &state) == SA_OK);
                expect(F.Fn.ControlStateSet(d, r, 0, &state, F.Data) == SA_OK);
                break;
            }
            case SAHPI_INVENTORY_RDR: {
                std::vector<uint64_t> buffer(1024);
                SaHpiUint32T actual = 0;
                auto *data = reinterpret_cast<SaHpiInventoryDataT *>(buffer.data());
                expect(F.Fn.EntityInventoryDataRead(d, r, 0, 8192, F.Data, data, &actual) == SA_OK);
                break;
            }
            case SAHPI_WATCHDOG_RDR: {
                SaHpiWatchdogT w{};
                w.Log = w.Running = SAHPI_TRUE;
                w.TimerUse = SAHPI_WTU_SMS_OS;
                w.TimerAction = SAHPI_WA_RESET;
                w.InitialCount = 5 + random() % 20;
                expect(F.Fn.WatchdogTimerSet(d, r, 0, &w, F.Data) == SA_OK);
                expect(F.Fn.WatchdogTimerReset(d, r, 0, F.Data) == SA_OK);
                expect(F.Fn.WatchdogTimerGet(d, r, 0, F.Data, &w) == SA_OK);
                break;
            }
            default: {
                SaHpiSelEntryT entry{};
                entry.Event.EventType = SAHPI_ET_USER;
                entry.Event.Severity = SAHPI_INFORMATIONAL;
                expect(F.Rpt.EventLogEntryAdd(d, r, &entry, F.User) == SA_OK);
                SaHpiSelEntryIdT prev = 0, id = SAHPI_OLDEST_ENTRY;
                while (id != SAHPI_NO_MORE_ENTRIES) {
                    SaErrorT rc = F.Rpt.EventLogEntryGet(d, r, id, F.User, &prev, &id, &entry,
                                                         nullptr, nullptr);
                    // Entries come and go under the walk.
                    expect(rc == SA_OK || rc == SA_ERR_HPI_NOT_PRESENT);
                    if (rc != SA_OK)
                        break;
                }
                expect(F.Rpt.ResourcePowerStateSet(d, r, SAHPI_HS_POWER_CYCLE, F.User) == SA_OK);
                if (random() % 8 == 0)
                    expect(F.Rpt.EventLogClear(d, r, F.User) == SA_OK);
                break;
            }
            }
        });
        expect(outcome != Outcome::Gone);
        Calls += outcome == Outcome::Done ? 1 : 0;
    }
}

TEST(SimulatorConcurrencyTest, ClientsRaceTheCountdownThreadAndUnloadingStopsIt)
{
    KviTempDir dir;
    const std::string config =
        dir.write("sim.conf", "mapl_modules = \"" + simulatorPath() +
                                  "\"\nmax_mapl_rwlocks_count = \"4\"\n"
                                  "KviSimProcessorBoards = \"6\"\nKviSimEventLogSize = \"8\"\n");
    ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, config.c_str()), SA_OK);
    ASSERT_EQ(kviCsDomainInitialize(), SA_OK);
    ASSERT_EQ(kviCsRdrInitialize(), SA_OK);
    ASSERT_EQ(kviDsMaplManagerInitialize(), SA_OK);
    const SaHpiInt32T baseline = kviTestLiveBlocks();
    ASSERT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    ASSERT_EQ(kviDsMaplManagerDiscoverResources(DOMAIN), SA_OK);

    std::vector<Target> targets;
    for (auto &[tag, r] : walkShelf().ByTag) {
        targets.push_back({r.Entry.ResourceId, SAHPI_FIRST_ENTRY, SAHPI_NO_RECORD});
        for (const Record &x : r.Records)
            targets.push_back({r.Entry.ResourceId, x.Rdr.RecordId, x.Rdr.RdrType});
    }
    // Nine resources; records: chassis 9, six boards 6 each, a tray of two
    // fans 4, a supply 5.
    ASSERT_EQ(targets.size(), 9u + 9 + 6 * 6 + 4 + 5);

    std::atomic<bool> stop{false};
    std::atomic<int> calls{0}, failures{0};
    std::vector<std::thread> clients;
    for (unsigned i = 0; i < 6; i++)
        clients.emplace_back(client, std::cref(targets), i + 1, std::cref(stop), std::ref(calls),
                             std::ref(failures));
    std::this_thread::sleep_for(std::chrono::milliseconds(300));
    stop = true;
    for (std::thread &t : clients)
        t.join();
    EXPECT_GT(calls.load(), 100) << "the clients got through";
    EXPECT_EQ(failures.load(), 0);

    // Unloading stops the countdown thread while it still has watchdogs to
    // expire, and takes the shelf out of the tables.
    int running = 0;
    for (const Target &t : targets)
        if (t.Type == SAHPI_WATCHDOG_RDR)
            frame(t, [&](Found &F) {
                SaHpiWatchdogT w{};
                w.Running = SAHPI_TRUE;
                w.TimerUse = SAHPI_WTU_SMS_OS;
                w.TimerAction = SAHPI_WA_POWER_CYCLE;
                w.InitialCount = 5 * ++running;
                F.Fn.WatchdogTimerSet(DOMAIN, t.Rid, 0, &w, F.Data);
                F.Fn.WatchdogTimerReset(DOMAIN, t.Rid, 0, F.Data);
            });
    ASSERT_EQ(running, 6);
    EXPECT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    for (const Target &t : targets)
        EXPECT_EQ(frame(t, [](Found &) {}), Outcome::Gone);
    SaHpiEntryIdT next = 0;
    SaHpiRptEntryT entry{};
    EXPECT_EQ(kviCsRptActiveEntryGet(DOMAIN, SAHPI_FIRST_ENTRY, &next, &entry, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviTestLiveBlocks(), baseline) << "the plug-in gave back all it took";
}

} // namespace
