// A writer killed at any moment must leave, after the next start, exactly one
// complete object per key, holding the value before or after the put that
// was cut short.
#include "core/utils/NonVolatileStorage.h"

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdio>
#include <cstring>
#include <dirent.h>
#include <fstream>
#include <iterator>
#include <map>
#include <random>
#include <string>
#include <sys/mman.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

constexpr int KEYS = 4;
constexpr int KILLS = 300;

// What the writer had begun and finished, per key, in memory shared with the
// test so that it survives the writer's death.
struct Progress {
    std::atomic<SaHpiUint32T> started[KEYS];
    std::atomic<SaHpiUint32T> done[KEYS];
    std::atomic<SaHpiUint32T> generation;
};

std::string keyOf(int k)
{
    return "crash.key." + std::to_string(k);
}

// Values differ in length too, so a file cut anywhere shows.
std::string valueOf(int k, SaHpiUint32T generation)
{
    return "k" + std::to_string(k) + "g" + std::to_string(generation) + ":" +
           std::string(generation % 97, static_cast<char>('a' + k));
}

[[noreturn]] void writeForever(Progress *progress)
{
    for (int k = 0;; k = (k + 1) % KEYS) {
        SaHpiUint32T generation = ++progress->generation;
        progress->started[k] = generation;
        std::string value = valueOf(k, generation);
        if (kviCsNonVolatilePut(keyOf(k).c_str(), static_cast<SaHpiUint32T>(value.size()),
                                value.data()) != SA_OK)
            _exit(3);
        progress->done[k] = generation;
    }
}

struct FileCheck {
    std::map<std::string, int> keys; // key -> files holding it
    int leftovers = 0;               // files too short to hold a size
    int bad = 0;                     // anything else
};

// Every file of the directory after a start: a sound object, or a leftover
// that the start leaves alone because it cannot even hold its size.
FileCheck checkFiles(const std::string &dir)
{
    FileCheck result;
    DIR *d = opendir(dir.c_str());
    if (d == nullptr)
        return result;
    while (dirent *e = readdir(d)) {
        std::string name = e->d_name;
        if (name == "." || name == "..")
            continue;
        std::ifstream in(dir + "/" + name, std::ios::binary);
        std::string bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        if (bytes.size() < 4) {
            ++result.leftovers;
            continue;
        }
        SaHpiUint32T size = 0;
        SaHpiUint32T crc = 0;
        memcpy(&size, bytes.data(), 4);
        if (bytes.size() < 12 || size != bytes.size()) {
            ++result.bad;
            continue;
        }
        memcpy(&crc, bytes.data() + 4, 4);
        auto keyLen = static_cast<unsigned char>(bytes[9]);
        if (crc != kviCsCrcGen(bytes.data() + 8, static_cast<SaHpiInt32T>(size - 8)) ||
            bytes[8] != 1 || keyLen == 0 || 12u + keyLen > size) {
            ++result.bad;
            continue;
        }
        ++result.keys[bytes.substr(12, keyLen)];
    }
    closedir(d);
    return result;
}

TEST(NvCrashTest, KilledWritersLeaveOneCompleteObjectPerKey)
{
    KviTempDir tmp;
    std::string dir = tmp.file("nv");
    ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE,
                              tmp.write("nv.conf", "KviNvStorageDir = \"" + dir + "\"\n").c_str()),
              SA_OK);
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);

    void *shared =
        mmap(nullptr, sizeof(Progress), PROT_READ | PROT_WRITE, MAP_SHARED | MAP_ANONYMOUS, -1, 0);
    ASSERT_NE(shared, MAP_FAILED);
    auto *progress = new (shared) Progress{};
    for (int k = 0; k < KEYS; ++k) {
        std::string value = valueOf(k, 0);
        ASSERT_EQ(kviCsNonVolatilePut(keyOf(k).c_str(), static_cast<SaHpiUint32T>(value.size()),
                                      value.data()),
                  SA_OK);
    }

    std::mt19937 random(20261121);
    int cutShort = 0;
    int leftoverRounds = 0;
    int extraFileRounds = 0; // partial files found before the start
    int duplicateRounds = 0; // two complete files of one key before the start
    for (int kill = 0; kill < KILLS && !HasFailure(); ++kill) {
        SCOPED_TRACE("kill " + std::to_string(kill));
        pid_t child = fork();
        ASSERT_GE(child, 0);
        if (child == 0)
            writeForever(progress);
        usleep(200 + random() % 3000);
        ASSERT_EQ(::kill(child, SIGKILL), 0);
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        ASSERT_TRUE(WIFSIGNALED(status)) << "the writer's put failed: status " << status;

        FileCheck onDisk = checkFiles(dir);
        extraFileRounds += onDisk.leftovers + onDisk.bad > 0 ? 1 : 0;
        int completeFiles = 0;
        for (const auto &[key, count] : onDisk.keys)
            completeFiles += count;
        duplicateRounds += completeFiles > KEYS ? 1 : 0;
        ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);

        FileCheck files = checkFiles(dir);
        EXPECT_EQ(files.bad, 0);
        leftoverRounds += files.leftovers > 0 ? 1 : 0;
        ASSERT_EQ(files.keys.size(), static_cast<size_t>(KEYS));
        for (int k = 0; k < KEYS; ++k) {
            SCOPED_TRACE(keyOf(k));
            EXPECT_EQ(files.keys[keyOf(k)], 1) << "one file per key";
            SaHpiUint32T before = progress->done[k];
            SaHpiUint32T after = progress->started[k];
            cutShort += before != after ? 1 : 0;
            char buffer[256];
            SaHpiUint32T bytesRead = 0;
            ASSERT_EQ(kviCsNonVolatileGet(keyOf(k).c_str(), 0, sizeof buffer, buffer, &bytesRead),
                      SA_ERR_HPI_DATA_TRUNCATED);
            std::string value(buffer, bytesRead);
            EXPECT_TRUE(value == valueOf(k, before) || value == valueOf(k, after))
                << "found " << value << ", expected generation " << before << " or " << after;
            // The next writer starts from what is on disk now.
            progress->started[k] = progress->done[k] = value == valueOf(k, before) ? before : after;
        }
    }
    // The kills must really have cut puts short, or the test proves little.
    EXPECT_GT(cutShort, KILLS / 10);
    EXPECT_GT(duplicateRounds, 0) << "no kill fell between the new file and the old one's unlink";
    RecordProperty("CutShort", cutShort);
    RecordProperty("RoundsWithLeftovers", leftoverRounds);
    RecordProperty("RoundsWithPartialFiles", extraFileRounds);
    RecordProperty("RoundsWithDuplicates", duplicateRounds);

    munmap(shared, sizeof(Progress));
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    kviCsConfigFinalize();
}

} // namespace
