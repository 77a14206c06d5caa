// How fast a configuration file turns into a list, and what a query costs at
// the far end of a long list (queries walk the list from its head).
#include <benchmark/benchmark.h>

#include <cstring>
#include <memory>
#include <string>

#include "core/utils/KviConfig.h"
#include "support/KviTestSupport.h"

namespace
{
// Logging opened once for the whole program at the daemon's usual level.
struct LogSession {
    KviTempDir dir;
    LogSession() { kviCsLogInitialize(KVI_LOG_INFO_NUM, dir.file("bench.log").c_str()); }
    ~LogSession() { kviCsLogClose(); }
};
LogSession &logSession()
{
    static LogSession session;
    return session;
}

// About 1 MB of what such files hold: comments, section headers, short
// numbers, module lists and longer paths.
std::string generatedFile(size_t bytes)
{
    std::string text = "# generated configuration\n[general]\n";
    for (size_t i = 0; text.size() < bytes; ++i) {
        std::string key = "Setting_" + std::to_string(i);
        switch (i % 4) {
        case 0:
            text += key + " = \"" + std::to_string(i * 7) + "\"\n";
            break;
        case 1:
            text += key + " = \"libMaplA.so;libMaplB.so;libMaplC.so\"\n";
            break;
        case 2:
            text += "# " + key + " is a path\n" + key + "\t=\t\"/var/lib/kvi/store/" +
                    std::to_string(i) + "\"\n";
            break;
        default:
            text += "[section" + std::to_string(i) + "]\n" + key + " = \"0x" +
                    std::to_string(i % 10000) + "\"\n";
        }
    }
    return text;
}

void BM_ParseGenerated1MB(benchmark::State &state)
{
    logSession();
    const std::string text = generatedFile(1u << 20);
    // Exactly the file's bytes, as the reader hands them over.
    std::unique_ptr<char[]> buffer(new char[text.size()]);
    memcpy(buffer.get(), text.data(), text.size());
    KviCsLinkedListT list{};
    KviCsCfgContainer cont{};
    cont.KeyValueList = &list;
    for (auto _ : state) {
        kviCsLinkedListInitialize(&list);
        kviCsCfgDataParseData(buffer.get(), static_cast<SaHpiUint32T>(text.size()), &cont);
        state.PauseTiming();
        kviCsCfgFreeKeyValueList(&list);
        state.ResumeTiming();
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * text.size()));
}
BENCHMARK(BM_ParseGenerated1MB)->Unit(benchmark::kMillisecond);

// The whole load: open, read, parse, and the teardown of the container.
void BM_LoadAndFinalizeGenerated1MBFile(benchmark::State &state)
{
    logSession();
    KviTempDir dir;
    const std::string text = generatedFile(1u << 20);
    std::string path = dir.write("kvi.conf", text);
    for (auto _ : state) {
        KviCsCfgContainer cont;
        kviCsConfigInitStructure(&cont, SAHPI_FALSE, path.c_str());
        kviCsConfigFinalizeStrucure(&cont);
    }
    state.SetBytesProcessed(static_cast<int64_t>(state.iterations() * text.size()));
}
BENCHMARK(BM_LoadAndFinalizeGenerated1MBFile)->Unit(benchmark::kMillisecond);

class ThousandKeys
{
  public:
    ThousandKeys()
    {
        std::string text;
        for (int i = 0; i < 1000; ++i)
            text += "key" + std::to_string(1000 + i) + " = \"" + std::to_string(i) + "\"\n";
        path_ = dir_.write("kvi.conf", text);
        kviCsConfigInitStructure(&cont_, SAHPI_FALSE, path_.c_str());
    }
    ~ThousandKeys() { kviCsConfigFinalizeStrucure(&cont_); }
    KviCsCfgContainer *container() { return &cont_; }

  private:
    KviTempDir dir_;
    std::string path_;
    KviCsCfgContainer cont_{};
};

void BM_LookupFirstOf1000Keys(benchmark::State &state)
{
    logSession();
    ThousandKeys keys;
    char value[16];
    for (auto _ : state)
        benchmark::DoNotOptimize(kviCsCfgDataGet("key1000", sizeof value, value, keys.container()));
}
BENCHMARK(BM_LookupFirstOf1000Keys);

void BM_LookupLastOf1000Keys(benchmark::State &state)
{
    logSession();
    ThousandKeys keys;
    char value[16];
    for (auto _ : state)
        benchmark::DoNotOptimize(kviCsCfgDataGet("key1999", sizeof value, value, keys.container()));
}
BENCHMARK(BM_LookupLastOf1000Keys);

void BM_Uint32LookupLastOf1000Keys(benchmark::State &state)
{
    logSession();
    ThousandKeys keys;
    SaHpiUint32T value = 0;
    for (auto _ : state)
        benchmark::DoNotOptimize(kviCsCfgDataUint32Get("key1999", &value, keys.container()));
}
BENCHMARK(BM_Uint32LookupLastOf1000Keys);
} // namespace
