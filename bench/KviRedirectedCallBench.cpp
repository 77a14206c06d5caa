// A redirected call through the whole front end: saHpiSensorReadingGet on
// the simulated shelf (gate, session, master lock, record lookup, plug-in
// lock, the plug-in's slot) with the log open at the daemon's usual level,
// beside the floor: the same slot behind plain POSIX reader/writer locks and a
// mutex, taken in the same order, with the record copied out as the lookup
// does.
#include <benchmark/benchmark.h>

#include <climits>
#include <cstdio>
#include <pthread.h>
#include <string>
#include <unistd.h>

#include "support/KviTestSupport.h"

namespace
{

std::string simulatorPath()
{
    char self[PATH_MAX] = "";
    const ssize_t n = readlink("/proc/self/exe", self, sizeof self - 1);
    std::string dir = std::string(self, n > 0 ? n : 0);
    return dir.substr(0, dir.rfind('/')) + "/../plugins/libKviSimulator.so";
}

// One shelf and one session for the whole program; the sensor read is the
// first threshold sensor found.
struct Shelf {
    KviTempDir dir;
    SaHpiSessionIdT session = 0;
    SaHpiResourceIdT rid = 0;
    SaHpiSensorNumT sensor = 0;
    SaHpiRdrT rdr{};
    KviDsRdrFnTable fn{};
    void *userData = nullptr;

    Shelf()
    {
        const std::string config = "mapl_modules = \"" + simulatorPath() +
                                   "\"\nKviSimProcessorBoards = \"2\"\nKviNvStorageDir = \"" +
                                   dir.path() + "\"\n";
        kviCsConfigInit(SAHPI_FALSE, dir.write("bench.conf", config).c_str());
        kviCsLogInitialize(KVI_LOG_INFO_NUM, dir.file("bench.log").c_str());
        SaHpiVersionT version = 0;
        const SaErrorT steps[] = {kviDsApiRedirectorInitialize(), saHpiInitialize(&version),
                                  saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr),
                                  saHpiResourcesDiscover(session)};
        for (SaErrorT rc : steps)
            if (rc != SA_OK) {
                fprintf(stderr, "the shelf did not start: %d (log in %s)\n", rc,
                        dir.file("bench.log").c_str());
                abort();
            }
        findSensor();
        if (sensor == 0) {
            fprintf(stderr, "no threshold sensor on the shelf\n");
            abort();
        }
    }

    void findSensor()
    {
        for (SaHpiEntryIdT at = SAHPI_FIRST_ENTRY; at != SAHPI_LAST_ENTRY && sensor == 0;) {
            SaHpiRptEntryT entry{};
            const SaErrorT rc = saHpiRptEntryGet(session, at, &at, &entry);
            if (rc != SA_OK) {
                fprintf(stderr, "the walk stopped: %d\n", rc);
                abort();
            }
            for (SaHpiEntryIdT r = SAHPI_FIRST_ENTRY, next = 0; r != SAHPI_LAST_ENTRY; r = next) {
                SaHpiBoolT active = SAHPI_FALSE;
                if (kviCsRdrGet(0, entry.ResourceId, SAHPI_NO_RECORD, r, &next, &rdr, &active,
                                &userData, &fn, nullptr, nullptr) != SA_OK)
                    break;
                if (rdr.RdrType == SAHPI_SENSOR_RDR &&
                    rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold) {
                    rid = entry.ResourceId;
                    sensor = rdr.RdrTypeUnion.SensorRec.Num;
                    return;
                }
            }
        }
    }
};

Shelf &shelf()
{
    static Shelf s;
    return s;
}

void BM_SensorReadingGet(benchmark::State &state)
{
    Shelf &s = shelf();
    SaHpiSensorReadingT reading{};
    for (auto _ : state)
        if (saHpiSensorReadingGet(s.session, s.rid, s.sensor, &reading) != SA_OK)
            state.SkipWithError("read failed");
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_SensorReadingGet)->Threads(1)->Threads(2)->UseRealTime();

// The floor's locks: the gate, the master lock, the table and the plug-in's.
pthread_rwlock_t floorGate = PTHREAD_RWLOCK_INITIALIZER;
pthread_rwlock_t floorMaster = PTHREAD_RWLOCK_INITIALIZER;
pthread_mutex_t floorTable = PTHREAD_MUTEX_INITIALIZER;
pthread_rwlock_t floorPlugin = PTHREAD_RWLOCK_INITIALIZER;

void BM_PosixFrameFloor(benchmark::State &state)
{
    Shelf &s = shelf();
    SaHpiSensorReadingT reading{};
    for (auto _ : state) {
        pthread_rwlock_rdlock(&floorGate);
        pthread_rwlock_rdlock(&floorMaster);
        pthread_mutex_lock(&floorTable);
        SaHpiRdrT rdr = s.rdr;
        KviDsRdrFnTable fn = s.fn;
        pthread_mutex_unlock(&floorTable);
        pthread_rwlock_rdlock(&floorPlugin);
        pthread_rwlock_unlock(&floorMaster);
        if (fn.SensorReadingGet(0, s.rid, s.sensor, rdr.RdrTypeUnion.SensorRec.Category, &rdr,
                                s.userData, &reading) != SA_OK)
            state.SkipWithError("read failed");
        pthread_rwlock_unlock(&floorPlugin);
        pthread_rwlock_unlock(&floorGate);
    }
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_PosixFrameFloor)->Threads(1)->Threads(2)->UseRealTime();

} // namespace
