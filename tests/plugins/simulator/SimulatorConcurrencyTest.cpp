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

// The frame of a redirected call: the entry is looked up under the master
// lock, the plug-in's lock is taken before the master lock is let go, and the
// slot runs under the plug-in's lock alone. Gone: the entry left the table.
template <typename Call> Outcome frame(SaHpiResourceIdT Rid, SaHpiEntryIdT RecordId, Call call)
{
    KviCsRwLockT *master = nullptr;
    if (kviDsMaplManagerGetMaplMasterLock(&master) != SA_OK ||
        KVI_CS_RW_LOCK_RD_LOCK(master, 1000) != SA_OK)
        return Outcome::Busy;
    SaHpiRptEntryT entry{};
    KviDsRptFnTable rptFn{};
    void *user = nullptr;
    SaHpiUint32T maplNum = 0;
    KviCsRwLockT *lock = nullptr;
    SaErrorT rc = kviCsRptActiveEntryGetByRid(DOMAIN, Rid, &entry, &rptFn, &user, &maplNum, &lock);
    SaHpiRdrT rdr{};
    KviDsRdrFnTable rdrFn{};
    void *data = nullptr;
    if (rc == SA_OK && RecordId != SAHPI_FIRST_ENTRY) {
        SaHpiBoolT active = SAHPI_FALSE;
        rc = kviCsRdrGet(DOMAIN, Rid, SAHPI_NO_RECORD, RecordId, nullptr, &rdr, &active, &data,
                         &rdrFn, nullptr, nullptr);
    }
    if (rc != SA_OK) {
        KVI_CS_DOA_RW_LOCK_RD_UNLOCK(master);
        return Outcome::Gone;
    }
    if (KVI_CS_RW_LOCK_RD_LOCK(lock, 1000) != SA_OK) {
        KVI_CS_DOA_RW_LOCK_RD_UNLOCK(master);
        return Outcome::Busy;
    }
    KVI_CS_DOA_RW_LOCK_RD_UNLOCK(master);
    call(entry, rptFn, user, rdr, rdrFn, data);
    KVI_CS_DOA_RW_LOCK_RD_UNLOCK(lock);
    return Outcome::Done;
}

struct Target {
    SaHpiResourceIdT Rid;
    SaHpiEntryIdT RecordId; // SAHPI_FIRST_ENTRY: the resource itself
    SaHpiRdrTypeT Type;
};

// One client: random calls until told to stop. Every result must be one the
// simulator gives for such a call.
void client(const std::vector<Target> &Targets, unsigned Seed, const std::atomic<bool> &Stop,
            std::atomic<int> &Calls, std::atomic<int> &Failures)
{
    std::mt19937 random(Seed);
    auto expect = [&](bool Ok) {
        if (!Ok)
            Failures++;
    };
    while (!Stop) {
        const Target &t = Targets[random() % Targets.size()];
        auto call = [&](SaHpiRptEntryT &, KviDsRptFnTable &Rpt, void *User, SaHpiRdrT &Rdr,
                        KviDsRdrFnTable &Fn, void *Data) {
            const SaHpiDomainIdT d = DOMAIN;
            const SaHpiResourceIdT r = t.Rid;
            switch (t.Type) {
            case SAHPI_SENSOR_RDR: {
                SaHpiSensorNumT n = Rdr.RdrTypeUnion.SensorRec.Num;
                SaHpiSensorReadingT reading{};
                expect(Fn.SensorReadingGet(d, r, n, 0, &Rdr, Data, &reading) == SA_OK);
                SaHpiSensorThresholdsT limits{};
                if (Fn.SensorThresholdsGet(d, r, n, &Rdr, Data, &limits) == SA_OK)
                    expect(Fn.SensorThresholdsSet(d, r, n, &Rdr, &limits, Data) == SA_OK);
                SaHpiEventT event{};
                SaErrorT rc = Fn.ActiveAlarmTranslate(d, r, n, Data, &Rdr, nullptr, &event);
                expect(rc == SA_OK || rc == SA_ERR_HPI_NOT_PRESENT);
                break;
            }
            case SAHPI_CTRL_RDR: {
                SaHpiCtrlNumT n = Rdr.RdrTypeUnion.CtrlRec.Num;
                SaHpiCtrlStateT state{};
                state.Type = Rdr.RdrTypeUnion.CtrlRec.Type;
                state.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
                expect(Fn.ControlStateGet(d, r, n, Data, &state) == SA_OK);
                expect(Fn.ControlStateSet(d, r, n, &state, Data) == SA_OK);
                break;
            }
            case SAHPI_INVENTORY_RDR: {
                std::vector<uint64_t> buffer(1024);
                SaHpiUint32T actual = 0;
                expect(Fn.EntityInventoryDataRead(
                           d, r, 0, 8192, Data,
                           reinterpret_cast<SaHpiInventoryDataT *>(buffer.data()),
                           &actual) == SA_OK);
                break;
            }
            case SAHPI_WATCHDOG_RDR: {
                SaHpiWatchdogNumT n = Rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
                SaHpiWatchdogT w{};
                w.Log = SAHPI_TRUE;
                w.Running = SAHPI_TRUE;
                w.TimerUse = SAHPI_WTU_SMS_OS;
                w.TimerAction = SAHPI_WA_RESET;
                w.InitialCount = 5 + random() % 20;
                expect(Fn.WatchdogTimerSet(d, r, n, &w, Data) == SA_OK);
                expect(Fn.WatchdogTimerReset(d, r, n, Data) == SA_OK);
                expect(Fn.WatchdogTimerGet(d, r, n, Data, &w) == SA_OK);
                break;
            }
            default: {
                SaHpiSelEntryT entry{};
                entry.Event.EventType = SAHPI_ET_USER;
                entry.Event.Severity = SAHPI_INFORMATIONAL;
                expect(Rpt.EventLogEntryAdd(d, r, &entry, User) == SA_OK);
                SaHpiSelEntryIdT id = SAHPI_OLDEST_ENTRY;
                while (id != SAHPI_NO_MORE_ENTRIES) {
                    SaHpiSelEntryIdT prev = 0;
                    SaErrorT rc =
                        Rpt.EventLogEntryGet(d, r, id, User, &prev, &id, &entry, nullptr, nullptr);
                    // Entries come and go under the walk.
                    expect(rc == SA_OK || rc == SA_ERR_HPI_NOT_PRESENT);
                    if (rc != SA_OK)
                        break;
                }
                expect(Rpt.ResourcePowerStateSet(d, r, SAHPI_HS_POWER_CYCLE, User) == SA_OK);
                if (random() % 8 == 0)
                    expect(Rpt.EventLogClear(d, r, User) == SA_OK);
                break;
            }
            }
        };
        Outcome outcome = frame(t.Rid, t.RecordId, call);
        expect(outcome != Outcome::Gone);
        if (outcome == Outcome::Done)
            Calls++;
    }
}

TEST(SimulatorConcurrencyTest, ClientsRaceTheCountdownThreadAndUnloadingStopsIt)
{
    KviTempDir dir;
    const std::string config = dir.write("sim.conf", "mapl_modules = \"" + simulatorPath() +
                                                         "\"\n"
                                                         "max_mapl_rwlocks_count = \"4\"\n"
                                                         "KviSimProcessorBoards = \"6\"\n"
                                                         "KviSimEventLogSize = \"8\"\n");
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
            frame(t.Rid, t.RecordId,
                  [&](SaHpiRptEntryT &, KviDsRptFnTable &, void *, SaHpiRdrT &Rdr,
                      KviDsRdrFnTable &Fn, void *Data) {
                      SaHpiWatchdogNumT n = Rdr.RdrTypeUnion.WatchdogRec.WatchdogNum;
                      SaHpiWatchdogT w{};
                      w.Running = SAHPI_TRUE;
                      w.TimerUse = SAHPI_WTU_SMS_OS;
                      w.TimerAction = SAHPI_WA_POWER_CYCLE;
                      w.InitialCount = 5 * ++running;
                      Fn.WatchdogTimerSet(DOMAIN, t.Rid, n, &w, Data);
                      Fn.WatchdogTimerReset(DOMAIN, t.Rid, n, Data);
                  });
    ASSERT_EQ(running, 6);
    EXPECT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    for (const Target &t : targets)
        EXPECT_EQ(frame(t.Rid, t.RecordId,
                        [](SaHpiRptEntryT &, KviDsRptFnTable &, void *, SaHpiRdrT &,
                           KviDsRdrFnTable &, void *) {}),
                  Outcome::Gone);
    SaHpiEntryIdT next = 0;
    SaHpiRptEntryT entry{};
    EXPECT_EQ(kviCsRptActiveEntryGet(DOMAIN, SAHPI_FIRST_ENTRY, &next, &entry, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviTestLiveBlocks(), baseline) << "the plug-in gave back all it took";
}

} // namespace
