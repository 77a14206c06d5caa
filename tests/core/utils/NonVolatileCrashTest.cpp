// A writer killed at any moment must leave, after the next start, exactly one
// complete object per key, holding the value before or after the put that
// was cut short. The writer dies at a chosen file operation of its puts, so
// every step of a put is cut, whatever the machine's speed.
#include "core/utils/NonVolatileStorage.h"

#include <atomic>
#include <csignal>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <string>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

constexpr int KEYS = 4;
// A replacing put makes seven file operations (open, write and close of the
// new file, open, sync and close of the directory, unlink of the old file):
// a cycle of 29 cut points, prime to 7 and to the keys, cuts each step of
// each key's put.
constexpr int CUT_POINTS = 29;
constexpr int KILLS = 4 * CUT_POINTS;

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

SaErrorT put(int k, SaHpiUint32T generation)
{
    std::string value = valueOf(k, generation);
    return kviCsNonVolatilePut(keyOf(k).c_str(), static_cast<SaHpiUint32T>(value.size()),
                               value.data());
}

// The writer's file operations pass through until the chosen one, which is
// cut as a kill or a power loss cuts it: a write lands only in part, any other
// operation not at all, and the writer dies.
int operationsBeforeCut;
size_t cutWriteBytes;

bool cutHere()
{
    return operationsBeforeCut-- == 0;
}

[[noreturn]] void die()
{
    raise(SIGKILL);
    _exit(4);
}

int cutOpen(const char *Path, int Flags, mode_t Mode)
{
    if (cutHere())
        die();
    return kviCsNvDefaultFileOps.openFile(Path, Flags, Mode);
}

ssize_t cutWrite(int Fd, const void *Buffer, size_t Count)
{
    if (cutHere()) {
        kviCsNvDefaultFileOps.writeFile(Fd, Buffer, cutWriteBytes % Count);
        die();
    }
    return kviCsNvDefaultFileOps.writeFile(Fd, Buffer, Count);
}

template <typename... Args> int cutOr(int (*Operation)(Args...), Args... Arguments)
{
    if (cutHere())
        die();
    return Operation(Arguments...);
}

int cutSync(int Fd)
{
    return cutOr(kviCsNvDefaultFileOps.syncFile, Fd);
}
int cutClose(int Fd)
{
    return cutOr(kviCsNvDefaultFileOps.closeFile, Fd);
}
int cutUnlink(const char *Path)
{
    return cutOr(kviCsNvDefaultFileOps.unlinkFile, Path);
}

[[noreturn]] void writeUntilCut(Progress *progress, int Cut)
{
    operationsBeforeCut = Cut;
    cutWriteBytes = static_cast<size_t>(Cut) * 7;
    kviCsNvFileOps = {cutOpen,  kviCsNvDefaultFileOps.readFile, cutWrite, cutSync, cutClose,
                      cutUnlink};
    for (int k = 0;; k = (k + 1) % KEYS) {
        SaHpiUint32T generation = ++progress->generation;
        progress->started[k] = generation;
        if (put(k, generation) != SA_OK)
            _exit(3);
        progress->done[k] = generation;
    }
}

// The files of the directory by the key of the complete object they hold;
// any other file counts under "", except a leftover too short to hold its
// size, which a start leaves alone.
std::map<std::string, int> filesByKey(const std::string &dir)
{
    std::map<std::string, int> keys;
    for (const auto &entry : std::filesystem::directory_iterator(dir)) {
        std::ifstream in(entry.path(), std::ios::binary);
        std::string bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        if (bytes.size() < 4)
            continue;
        SaHpiUint32T size = 0;
        SaHpiUint32T crc = 0;
        memcpy(&size, bytes.data(), 4);
        size_t keyLen = bytes.size() >= 12 ? static_cast<unsigned char>(bytes[9]) : 0;
        bool complete = keyLen > 0 && size == bytes.size() && bytes[8] == 1 && 12 + keyLen <= size;
        if (complete)
            memcpy(&crc, bytes.data() + 4, 4);
        complete =
            complete && crc == kviCsCrcGen(bytes.data() + 8, static_cast<SaHpiInt32T>(size - 8));
        ++keys[complete ? bytes.substr(12, keyLen) : ""];
    }
    return keys;
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
    for (int k = 0; k < KEYS; ++k)
        ASSERT_EQ(put(k, 0), SA_OK);

    int cutShort = 0;
    int duplicates = 0; // keys with two complete files before the start
    int damaged = 0;    // partial files before the start
    for (int kill = 0; kill < KILLS && !HasFailure(); ++kill) {
        SCOPED_TRACE("kill " + std::to_string(kill));
        pid_t child = fork();
        ASSERT_GE(child, 0);
        if (child == 0)
            writeUntilCut(progress, kill % CUT_POINTS);
        int status = 0;
        ASSERT_EQ(waitpid(child, &status, 0), child);
        ASSERT_TRUE(WIFSIGNALED(status)) << "the writer's put failed: status " << status;
        std::map<std::string, int> before = filesByKey(dir);
        damaged += before.count("") != 0 ? 1 : 0;
        before.erase("");
        for (const auto &[key, count] : before)
            duplicates += count > 1 ? 1 : 0;

        ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
        std::map<std::string, int> files = filesByKey(dir);
        EXPECT_EQ(files.count(""), 0u) << "a damaged file survived the start";
        for (int k = 0; k < KEYS; ++k) {
            SCOPED_TRACE(keyOf(k));
            EXPECT_EQ(files[keyOf(k)], 1) << "one file per key";
            SaHpiUint32T done = progress->done[k];
            SaHpiUint32T started = progress->started[k];
            cutShort += done != started ? 1 : 0;
            char buffer[256];
            SaHpiUint32T bytesRead = 0;
            ASSERT_EQ(kviCsNonVolatileGet(keyOf(k).c_str(), 0, sizeof buffer, buffer, &bytesRead),
                      SA_ERR_HPI_DATA_TRUNCATED);
            std::string value(buffer, bytesRead);
            EXPECT_TRUE(value == valueOf(k, done) || value == valueOf(k, started))
                << "found " << value << ", expected generation " << done << " or " << started;
            // The next writer starts from what is on disk now.
            progress->started[k] = progress->done[k] = value == valueOf(k, done) ? done : started;
        }
        EXPECT_EQ(files.size(), static_cast<size_t>(KEYS));
    }
    // Every kill fell inside a put, some in the middle of its write, some
    // between the new file and the old one's unlink.
    EXPECT_EQ(cutShort, KILLS);
    EXPECT_GT(damaged, 0) << "no write was cut short";
    EXPECT_GT(duplicates, 0) << "no kill fell between the new file and the old one's unlink";
    munmap(shared, sizeof(Progress));
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    kviCsConfigFinalize();
}

} // namespace
