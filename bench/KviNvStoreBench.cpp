// Costs of the non-volatile object store on the build machine's disk: put
// (a synchronous write of a new file, a directory sync and the unlink of the
// old file), get (a stat, an open and two reads: no cache), find (a walk of
// the list) and the start with 1000 objects present. A raw synchronous file
// write is the floor a put cannot beat.
#include <benchmark/benchmark.h>

#include <cstdio>
#include <cstring>
#include <fcntl.h>
#include <fstream>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

#include "core/utils/NonVolatileStorage.h"
#include "kvi/KviNonVolatile.h"
#include "support/KviTestSupport.h"

namespace
{
constexpr char SMALL_VALUE[] = "sixteen bytes!!";

std::string keyOf(int i)
{
    return "kviBenchKey" + std::to_string(i);
}

// An object file as the store writes it, so a large store can be set up
// without paying a synchronous put per object.
std::string encode(const std::string &key, const std::string &data)
{
    std::string object(12, '\0');
    auto size = static_cast<SaHpiUint32T>(12 + key.size() + data.size());
    memcpy(object.data(), &size, 4);
    object[8] = 1;
    object[9] = static_cast<char>(key.size());
    object += key + data;
    SaHpiUint32T crc = kviCsCrcGen(object.data() + 8, static_cast<SaHpiInt32T>(size - 8));
    memcpy(object.data() + 4, &crc, 4);
    return object;
}

// A started store over a fresh directory holding `objects` objects, with
// logging open at the daemon's usual level.
class Store
{
  public:
    explicit Store(int objects)
    {
        kviCsLogInitialize(KVI_LOG_INFO_NUM, tmp_.file("bench.log").c_str());
        std::string dir = tmp_.file("nv");
        mkdir(dir.c_str(), 0777);
        for (int i = 0; i < objects; ++i) {
            char name[16];
            snprintf(name, sizeof name, "%10.10d", i);
            std::ofstream(dir + "/" + name, std::ios::binary)
                << encode(keyOf(i), std::string(SMALL_VALUE, sizeof SMALL_VALUE));
        }
        std::string conf = "KviNvStorageDir = \"" + dir + "\"\nKviMaxNvObjects = \"100000\"\n";
        kviCsConfigInit(SAHPI_FALSE, tmp_.write("nv.conf", conf).c_str());
        ok_ = kviCsNonVolatileInitialize() == SA_OK;
    }
    ~Store()
    {
        kviCsNonVolatileFinalize();
        kviCsConfigFinalize();
        kviCsLogClose();
    }
    Store(const Store &) = delete;
    Store &operator=(const Store &) = delete;
    bool ok() const { return ok_; }

  private:
    KviTempDir tmp_;
    bool ok_ = false;
};

// Replaces the first object once per iteration.
void replaceFirstObject(benchmark::State &state, const Store &store)
{
    if (!store.ok())
        state.SkipWithError("store did not start");
    for (auto _ : state)
        if (kviCsNonVolatilePut("kviBenchKey0", sizeof SMALL_VALUE, SMALL_VALUE) != SA_OK)
            state.SkipWithError("put failed");
}

void BM_NvPutReplace(benchmark::State &state)
{
    replaceFirstObject(state, Store(static_cast<int>(state.range(0))));
}
BENCHMARK(BM_NvPutReplace)->Arg(1)->Arg(1000)->Arg(10000)->Unit(benchmark::kMicrosecond);

// What the directory sync before the old file's unlink costs a put.
void BM_NvPutReplaceWithoutDirectorySync(benchmark::State &state)
{
    Store store(1);
    kviCsNvFileOps.syncFile = [](int) { return 0; };
    replaceFirstObject(state, store);
    kviCsNvFileOps = kviCsNvDefaultFileOps;
}
BENCHMARK(BM_NvPutReplaceWithoutDirectorySync)->Unit(benchmark::kMicrosecond);

void BM_NvPutNewThenDelete(benchmark::State &state)
{
    Store store(static_cast<int>(state.range(0)));
    if (!store.ok())
        state.SkipWithError("store did not start");
    for (auto _ : state) {
        if (kviCsNonVolatilePut("kviBenchFresh", sizeof SMALL_VALUE, SMALL_VALUE) != SA_OK ||
            kviCsNonVolatileDelete("kviBenchFresh") != SA_OK)
            state.SkipWithError("put or delete failed");
    }
}
BENCHMARK(BM_NvPutNewThenDelete)->Arg(1)->Arg(1000)->Unit(benchmark::kMicrosecond);

void BM_NvGet(benchmark::State &state)
{
    const int objects = static_cast<int>(state.range(0));
    Store store(objects);
    std::string key = keyOf(objects - 1); // the last entry of the list
    char buffer[sizeof SMALL_VALUE];
    for (auto _ : state) {
        SaHpiUint32T bytesRead = 0;
        if (kviCsNonVolatileGet(key.c_str(), 0, sizeof buffer, buffer, &bytesRead) != SA_OK)
            state.SkipWithError("get failed");
        benchmark::DoNotOptimize(buffer);
    }
}
BENCHMARK(BM_NvGet)->Arg(1)->Arg(1000)->Unit(benchmark::kMicrosecond);

void BM_NvFind(benchmark::State &state)
{
    const int objects = static_cast<int>(state.range(0));
    Store store(objects);
    // The prefix of ten keys, as a parameter-control restore of one resource
    // looks up its records.
    std::string buffer(KVI_MAX_NV_KEY_LENGTH * 16, '\0');
    for (auto _ : state) {
        SaHpiUint32T needed = 0;
        if (kviCsNonVolatileFind("kviBenchKey1", static_cast<SaHpiUint32T>(buffer.size()),
                                 buffer.data(), &needed) == SA_ERR_HPI_INVALID_PARAMS)
            state.SkipWithError("find failed");
        benchmark::DoNotOptimize(needed);
    }
}
BENCHMARK(BM_NvFind)->Arg(10)->Arg(1000)->Unit(benchmark::kMicrosecond);

void BM_NvInitialize(benchmark::State &state)
{
    Store store(static_cast<int>(state.range(0)));
    for (auto _ : state) {
        state.PauseTiming();
        kviCsNonVolatileFinalize();
        state.ResumeTiming();
        if (kviCsNonVolatileInitialize() != SA_OK)
            state.SkipWithError("initialize failed");
    }
    state.SetItemsProcessed(state.iterations() * state.range(0));
}
BENCHMARK(BM_NvInitialize)->Arg(1000)->Unit(benchmark::kMillisecond);

// The floor of a put: one small synchronous file write without the store.
void BM_RawSyncWrite(benchmark::State &state)
{
    KviTempDir tmp;
    std::string path = tmp.file("0000000000");
    for (auto _ : state) {
        int fd = open(path.c_str(), O_RDWR | O_CREAT | O_TRUNC | O_SYNC, 0600);
        if (fd < 0 || write(fd, SMALL_VALUE, sizeof SMALL_VALUE) < 0)
            state.SkipWithError("write failed");
        close(fd);
    }
}
BENCHMARK(BM_RawSyncWrite)->Unit(benchmark::kMicrosecond);

} // namespace
