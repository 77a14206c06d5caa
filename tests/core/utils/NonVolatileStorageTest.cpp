#include "core/utils/NonVolatileStorage.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <dirent.h>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <sys/stat.h>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
namespace fs = std::filesystem;

// ---------------------------------------------------------------------------
// Object files built by hand, byte for byte as the store lays them out.

void putU32(std::string &bytes, size_t offset, SaHpiUint32T value)
{
    memcpy(bytes.data() + offset, &value, sizeof value);
}

SaHpiUint32T u32At(const std::string &bytes, size_t offset)
{
    SaHpiUint32T value = 0;
    memcpy(&value, bytes.data() + offset, sizeof value);
    return value;
}

// Recomputes the CRC over everything after the Crc field.
void reseal(std::string &object)
{
    putU32(object, 4, kviCsCrcGen(object.data() + 8, static_cast<SaHpiInt32T>(object.size() - 8)));
}

std::string encode(const std::string &key, const std::string &data, SaHpiUint8T version = 1)
{
    std::string object(12, '\0');
    putU32(object, 0, static_cast<SaHpiUint32T>(12 + key.size() + data.size()));
    object[8] = static_cast<char>(version);
    object[9] = static_cast<char>(key.size());
    object += key;
    object += data;
    reseal(object);
    return object;
}

std::string fileName(SaHpiUint32T number)
{
    char name[16];
    snprintf(name, sizeof name, "%10.10u", number);
    return name;
}

std::string readFile(const std::string &path)
{
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

// Names in the order the directory yields them, as the store meets them.
std::vector<std::string> directoryOrder(const std::string &dir)
{
    std::vector<std::string> names;
    if (DIR *d = opendir(dir.c_str())) {
        while (dirent *e = readdir(d))
            if (strcmp(e->d_name, ".") != 0 && strcmp(e->d_name, "..") != 0)
                names.push_back(e->d_name);
        closedir(d);
    }
    return names;
}

std::vector<std::string> sortedNames(const std::string &dir)
{
    auto names = directoryOrder(dir);
    std::sort(names.begin(), names.end());
    return names;
}

// A line with the text at the level, as the logger labels it.
bool loggedAt(const KviLogCapture &log, SaHpiUint32T level, const std::string &text)
{
    const char *label = level >= KVI_LOG_ERR_NONFATAL_NUM ? KVI_LOG_ERROR_STRING
                        : level == KVI_LOG_WARN_NUM       ? KVI_LOG_WARNING_STRING
                        : level == KVI_LOG_INFO_NUM       ? KVI_LOG_INFO_STRING
                                                          : KVI_LOG_DEBUG_STRING;
    char tag[32];
    snprintf(tag, sizeof tag, "%s %3.3u", label, level);
    for (const std::string &line : log.matching(text))
        if (line.find(tag) != std::string::npos)
            return true;
    return false;
}

// ---------------------------------------------------------------------------
// I/O seams: each replaces one call of the table for one test.

std::string seamDir;
std::vector<std::vector<std::string>> namesAtUnlink;
int openFlags = 0;
mode_t openMode = 0;
int openErrno = 0;
int writeErrno = 0;
int unlinkErrno = 0;

int recordingOpen(const char *path, int flags, mode_t mode)
{
    if ((flags & O_CREAT) != 0) {
        openFlags = flags;
        openMode = mode;
    }
    return open(path, flags, mode);
}

int failingCreate(const char *path, int flags, mode_t mode)
{
    if ((flags & O_CREAT) == 0)
        return open(path, flags, mode);
    errno = openErrno;
    return -1;
}

ssize_t failingWrite(int, const void *, size_t)
{
    errno = writeErrno;
    return -1;
}

// A disk that fills up half-way through the object.
ssize_t halfWrite(int fd, const void *buffer, size_t count)
{
    ssize_t written = write(fd, buffer, count / 2);
    errno = ENOSPC;
    return written;
}

int recordingUnlink(const char *path)
{
    namesAtUnlink.push_back(sortedNames(seamDir));
    return unlink(path);
}

int failingUnlink(const char *)
{
    errno = unlinkErrno;
    return -1;
}

// ---------------------------------------------------------------------------

class NvStoreTest : public testing::Test
{
  protected:
    void SetUp() override
    {
        baseline_ = kviTestLiveBlocks();
        kviCsNvFileOps = kviCsNvDefaultFileOps;
        seamDir = dir;
        namesAtUnlink.clear();
    }

    void TearDown() override
    {
        kviCsNvFileOps = kviCsNvDefaultFileOps;
        kviCsMemoryFailNthAllocation(0);
        kviCsNonVolatileFinalize();
        if (configured_)
            kviCsConfigFinalize();
        EXPECT_EQ(kviTestLiveBlocks(), baseline_) << "blocks leaked";
    }

    // The default container with the storage directory and the lines given;
    // the object limit is always set, since the store keeps an earlier
    // initialization's value when the key is missing.
    void configure(const std::string &lines = "KviMaxNvObjects = \"1000\"\n",
                   const std::string &storageDir = "")
    {
        if (configured_)
            kviCsConfigFinalize();
        std::string text =
            "KviNvStorageDir = \"" + (storageDir.empty() ? dir : storageDir) + "\"\n" + lines;
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, tmp.write("nv.conf", text).c_str()), SA_OK);
        configured_ = true;
    }

    SaErrorT start(const std::string &lines = "KviMaxNvObjects = \"1000\"\n")
    {
        configure(lines);
        return kviCsNonVolatileInitialize();
    }

    SaErrorT restart()
    {
        EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        return kviCsNonVolatileInitialize();
    }

    static SaErrorT put(const std::string &key, const std::string &data)
    {
        return kviCsNonVolatilePut(key.c_str(), static_cast<SaHpiUint32T>(data.size()),
                                   data.data());
    }

    // The whole data of the key, or the code of a failed get.
    static std::string get(const std::string &key, SaErrorT *rc = nullptr)
    {
        char buffer[4096];
        SaHpiUint32T bytesRead = 0;
        SaErrorT result = kviCsNonVolatileGet(key.c_str(), 0, sizeof buffer, buffer, &bytesRead);
        if (rc != nullptr)
            *rc = result;
        else
            EXPECT_EQ(result, SA_ERR_HPI_DATA_TRUNCATED) << "get " << key;
        return std::string(buffer, bytesRead);
    }

    static SaErrorT getRc(const std::string &key)
    {
        SaErrorT rc = SA_OK;
        get(key, &rc);
        return rc;
    }

    std::string objectPath(SaHpiUint32T number) const { return dir + "/" + fileName(number); }
    void plant(SaHpiUint32T number, const std::string &bytes) const
    {
        fs::create_directories(dir);
        std::ofstream(objectPath(number), std::ios::binary) << bytes;
    }

    KviTempDir tmp;
    std::string dir = tmp.file("nv");

  private:
    SaHpiInt32T baseline_ = 0;
    bool configured_ = false;
};

// ---------------------------------------------------------------------------
// Files on disk

TEST_F(NvStoreTest, ObjectFileIsHeaderKeyAndDataByteForByte)
{
    ASSERT_EQ(start(), SA_OK);
    const std::string data("\x01\x02\x00\xfe\x05", 5);
    ASSERT_EQ(put("abc", data), SA_OK);

    std::string file = readFile(objectPath(0));
    ASSERT_EQ(file.size(), 20u);
    EXPECT_EQ(u32At(file, 0), 20u);                      // Size
    EXPECT_EQ(file[8], 1);                               // NvVersion
    EXPECT_EQ(file[9], 3);                               // KeyLen
    EXPECT_EQ(file.substr(10, 2), std::string(2, '\0')); // reserved, written as zeros
    EXPECT_EQ(file.substr(12, 3), "abc");
    EXPECT_EQ(file.substr(15), data);
    EXPECT_EQ(u32At(file, 4), kviCsCrcGen(file.data() + 8, 12));
    EXPECT_EQ(file, encode("abc", data));

    struct stat status {
    };
    ASSERT_EQ(stat(objectPath(0).c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0600u);
}

TEST_F(NvStoreTest, PutCreatesTheFileForSynchronousWrites)
{
    ASSERT_EQ(start(), SA_OK);
    kviCsNvFileOps.openFile = recordingOpen;
    ASSERT_EQ(put("k", "v"), SA_OK);
    EXPECT_EQ(openFlags & O_ACCMODE, O_RDWR);
    EXPECT_EQ(openFlags & (O_CREAT | O_TRUNC), O_CREAT | O_TRUNC);
    EXPECT_EQ(openFlags & O_SYNC, O_SYNC);
    EXPECT_EQ(openMode, 0600u);
}

TEST_F(NvStoreTest, ObjectsSurviveARestartAndGetReadsTheDiskEveryTime)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("one", "first"), SA_OK);
    ASSERT_EQ(put("two", std::string(3000, 'x')), SA_OK);
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("one"), "first");
    EXPECT_EQ(get("two"), std::string(3000, 'x'));

    // No cache: a file changed behind the store's back is what get returns.
    std::ofstream(objectPath(0), std::ios::binary) << encode("one", "changed");
    EXPECT_EQ(get("one"), "changed");
}

TEST_F(NvStoreTest, ReplacingWritesTheLowestFreeNumberBeforeRemovingTheOldFile)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k0", "a"), SA_OK);
    ASSERT_EQ(put("k1", "b"), SA_OK);
    ASSERT_EQ(put("k2", "c"), SA_OK);

    kviCsNvFileOps.unlinkFile = recordingUnlink;
    KviLogCapture log;
    ASSERT_EQ(put("k0", "new"), SA_OK);
    // When the old file went, the new one was already complete.
    ASSERT_EQ(namesAtUnlink.size(), 1u);
    EXPECT_EQ(namesAtUnlink[0],
              (std::vector<std::string>{fileName(0), fileName(1), fileName(2), fileName(3)}));
    EXPECT_EQ(sortedNames(dir), (std::vector<std::string>{fileName(1), fileName(2), fileName(3)}));
    EXPECT_EQ(readFile(objectPath(3)), encode("k0", "new"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "ObjectNumber to use is 3"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM,
                         "Key k0 already exists. Deleting old obj 0000000000 at index 0"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Attempting to delete  " + objectPath(0)));

    ASSERT_EQ(put("k3", "d"), SA_OK);
    EXPECT_EQ(readFile(objectPath(0)), encode("k3", "d"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM,
                         "Key k3 does not yet exist. Marking new object as valid."));
}

TEST_F(NvStoreTest, LowestFreeNumberIsFoundBeyondThousandsOfObjects)
{
    ASSERT_EQ(start("KviMaxNvObjects = \"5000\"\n"), SA_OK);
    ASSERT_EQ(KVI_CS_SEM_TRYWAIT(kviCsNvListSemaphore()), SA_OK);
    SaHpiUint32T index = 0;
    auto add = [&](SaHpiUint32T number, SaHpiBoolT valid) {
        std::string key = "k" + std::to_string(number);
        return addNvObjectToList(key.c_str(), static_cast<SaHpiUint8T>(key.size()),
                                 fileName(number).c_str(), valid, &index);
    };
    for (SaHpiUint32T i = 0; i < 4100; ++i) {
        if (i != 4097) {
            ASSERT_EQ(add(i, SAHPI_TRUE), SA_OK);
        }
    }
    EXPECT_EQ(lowestFreeObjectNumber(), 4097u);
    ASSERT_EQ(add(4097, SAHPI_TRUE), SA_OK);
    ASSERT_EQ(add(4100, SAHPI_FALSE), SA_OK); // a put in progress does not count
    EXPECT_EQ(lowestFreeObjectNumber(), 4100u);
    ASSERT_EQ(deleteNvObjectFromList(17, SAHPI_FALSE), SA_OK);
    EXPECT_EQ(lowestFreeObjectNumber(), 17u);
    EXPECT_EQ(findNvObjectInListByFileNumber(4097), 4098u); // added after 4099, moved down by one
    EXPECT_EQ(findNvObjectInListByFileNumber(4100), NV_INVALID_LIST_ENTRY);
    ASSERT_EQ(KVI_CS_SEM_POST(kviCsNvListSemaphore()), SA_OK);
}

TEST_F(NvStoreTest, DeleteRemovesEntryAndFile)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("gone", "x"), SA_OK);
    ASSERT_EQ(put("kept", "y"), SA_OK);
    EXPECT_EQ(kviCsNonVolatileDelete("gone"), SA_OK);
    EXPECT_EQ(getRc("gone"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(sortedNames(dir), std::vector<std::string>{fileName(1)});
    EXPECT_EQ(kviCsNonVolatileDelete("gone"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(get("kept"), "y");

    // The entry goes even when the file cannot: the next start finds it again.
    KviLogCapture log;
    unlinkErrno = EACCES;
    kviCsNvFileOps.unlinkFile = failingUnlink;
    EXPECT_EQ(kviCsNonVolatileDelete("kept"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not delete object file " + objectPath(1) + ". err=13("));
    EXPECT_EQ(getRc("kept"), SA_ERR_HPI_NOT_PRESENT);
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("kept"), "y");
}

// ---------------------------------------------------------------------------
// Arguments

TEST_F(NvStoreTest, KeyLengthsAreCheckedModulo256)
{
    ASSERT_EQ(start(), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(put(std::string(29, 'k'), "ok"), SA_OK);
    EXPECT_EQ(put(std::string(30, 'k'), "no"), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Invalid KeyLen. kl=30, max is 29"));
    EXPECT_TRUE(log.contains("nvKeyIsValid returned false for key " + std::string(30, 'k')));
    EXPECT_EQ(put("", "no"), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(put(std::string(256, 'k'), "no"), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Invalid KeyLen. kl=0, max is 29"));

    // The length travels in 8 bits: 257 characters pass as a 1-byte key.
    EXPECT_EQ(put("q" + std::string(256, 'z'), "wrapped"), SA_OK);
    EXPECT_EQ(get("q"), "wrapped");
    EXPECT_EQ(get(std::string(29, 'k')), "ok");
}

TEST_F(NvStoreTest, ArgumentsAreRefusedBeforeAnythingElse)
{
    KviLogCapture log;
    char buffer[8];
    SaHpiUint32T count = 0;
    // Not even initialized yet: the argument checks come first.
    EXPECT_EQ(kviCsNonVolatilePut(nullptr, 0, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("BytesToWrite of 0 is not valid"));
    EXPECT_EQ(kviCsNonVolatilePut("k", 0x7FFFFFFF, buffer), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("BytesToWrite of 2147483647 is not valid"));
    EXPECT_EQ(kviCsNonVolatilePut(nullptr, 1, buffer), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Key pointer is NULL."));
    EXPECT_EQ(kviCsNonVolatilePut("k", 1, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Buffer pointer is NULL."));
    EXPECT_EQ(kviCsNonVolatileGet("k", 0, 1, buffer, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("BytesRead pointer is NULL."));
    EXPECT_EQ(kviCsNonVolatileFind(nullptr, 0, buffer, &count), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("SearchKey pointer is NULL."));
    EXPECT_EQ(kviCsNonVolatileFind("k", 0, buffer, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("BufferSizeReqd pointer is NULL."));
    EXPECT_EQ(kviCsNonVolatileDelete(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsNonVolatileGet("", 0, 1, buffer, &count), SA_ERR_HPI_INVALID_PARAMS);

    log.clear();
    EXPECT_EQ(kviCsNonVolatilePut("k", 1, buffer), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileGet("k", 0, 1, buffer, &count), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileDelete("k"), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileFind("k", 8, buffer, &count), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(log.matching("NV storage is not initialized.").size(), 5u);
}

TEST_F(NvStoreTest, InitializeTwiceIsADuplicate)
{
    ASSERT_EQ(start(), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "NV storage is already initialized."));
}

TEST_F(NvStoreTest, GetCopiesWhatExistsFromTheOffset)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "0123456789"), SA_OK);
    char buffer[16] = {};
    SaHpiUint32T bytesRead = 99;

    EXPECT_EQ(kviCsNonVolatileGet("k", 2, 5, buffer, &bytesRead), SA_OK);
    EXPECT_EQ(std::string(buffer, bytesRead), "23456");
    EXPECT_EQ(kviCsNonVolatileGet("k", 0, 10, buffer, &bytesRead), SA_OK);
    EXPECT_EQ(bytesRead, 10u);

    KviLogCapture log;
    EXPECT_EQ(kviCsNonVolatileGet("k", 7, 5, buffer, &bytesRead), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(std::string(buffer, bytesRead), "789");
    EXPECT_TRUE(log.contains("does not have enough data to fulfill request.  objectSize=10, "
                             "ObjectOffset=7, BytesToRead=5"));
    EXPECT_EQ(kviCsNonVolatileGet("k", 10, 1, buffer, &bytesRead), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(bytesRead, 0u);
    EXPECT_TRUE(log.contains("does not have any data to fulfill request.  objectSize=10, "
                             "ObjectOffset=10"));
    EXPECT_EQ(kviCsNonVolatileGet("k", 0xFFFFFFFF, 0xFFFFFFFF, buffer, &bytesRead),
              SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(kviCsNonVolatileGet("k", 0, 0, buffer, &bytesRead), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("BytesToRead is zero"));
    EXPECT_EQ(kviCsNonVolatileGet("none", 0, 1, buffer, &bytesRead), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Key none does not exist."));
}

TEST_F(NvStoreTest, FindListsMatchingKeysInListOrderIn30ByteSlots)
{
    ASSERT_EQ(start(), SA_OK);
    for (const char *key : {"kviResTag0001", "kviResSev0001", "kviResTag0002", "other"})
        ASSERT_EQ(put(key, "v"), SA_OK);
    ASSERT_EQ(put("kviResTag0001", "replaced"), SA_OK); // moves to the end of the list

    std::string buffer(100, '#');
    SaHpiUint32T needed = 0;
    EXPECT_EQ(kviCsNonVolatileFind("kviResTag", 100, buffer.data(), &needed), SA_OK);
    EXPECT_EQ(needed, 60u);
    EXPECT_EQ(buffer.substr(0, 30), "kviResTag0002" + std::string(17, '\0'));
    EXPECT_EQ(buffer.substr(30, 30), "kviResTag0001" + std::string(17, '\0'));
    EXPECT_EQ(buffer.substr(60), std::string(40, '#'));

    // Slots that fit are filled; the rest is only counted.
    buffer.assign(100, '#');
    KviLogCapture log;
    EXPECT_EQ(kviCsNonVolatileFind("kviRes", 59, buffer.data(), &needed),
              SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(needed, 90u);
    EXPECT_EQ(buffer.substr(0, 13), "kviResSev0001");
    EXPECT_EQ(buffer.substr(30), std::string(70, '#'));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM,
                         "Caller provided Buffer of size 59 was too small.  Needed 90."));
    EXPECT_EQ(kviCsNonVolatileFind("kviRes", 0, buffer.data(), &needed), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(needed, 90u);

    EXPECT_EQ(kviCsNonVolatileFind("kviResTag00011", 100, buffer.data(), &needed), SA_OK);
    EXPECT_EQ(needed, 0u);
    EXPECT_EQ(kviCsNonVolatileFind("other", 100, buffer.data(), &needed), SA_OK);
    EXPECT_EQ(needed, 30u);
    EXPECT_EQ(kviCsNonVolatileFind("", 100, buffer.data(), &needed), SA_ERR_HPI_INVALID_PARAMS);
}

// ---------------------------------------------------------------------------
// Configuration and limits

TEST_F(NvStoreTest, MaxObjectsRoundsDownToWholeListIncrements)
{
    KviLogCapture log;
    ASSERT_EQ(start("KviMaxNvObjects = \"15\"\n"), SA_OK);
    EXPECT_TRUE(log.contains("Using KviNvStorageDir value of " + dir + "."));
    EXPECT_TRUE(log.contains("Using KviMaxNvObjects value of 15."));
    for (int i = 0; i < 10; ++i)
        ASSERT_EQ(put("k" + std::to_string(i), "v"), SA_OK) << i;
    EXPECT_EQ(put("k10", "v"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Too Many NV objects.  Either delete some or raise the MaxNvObjects "
                             "config option."));
    EXPECT_TRUE(log.contains("addNvObjectToList failed for key k10. rc=-1007"));
    // A replacement needs a slot for the new entry before the old one goes.
    EXPECT_EQ(put("k3", "w"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_EQ(get("k3"), "v");
    EXPECT_EQ(sortedNames(dir).size(), 10u);

    ASSERT_EQ(kviCsNonVolatileDelete("k0"), SA_OK);
    EXPECT_EQ(put("k10", "v"), SA_OK);
}

TEST_F(NvStoreTest, InvalidOrMissingMaxObjectsKeepsTheValueInForce)
{
    ASSERT_EQ(start("KviMaxNvObjects = \"12abc\"\n"), SA_OK); // trailing characters ignored
    for (int i = 0; i < 10; ++i)
        ASSERT_EQ(put("k" + std::to_string(i), "v"), SA_OK);
    EXPECT_EQ(put("k10", "v"), SA_ERR_HPI_OUT_OF_SPACE);

    struct Case {
        const char *lines;
        const char *message;
        SaHpiUint32T level;
    } cases[] = {
        {"KviMaxNvObjects = \"9\"\n",
         "KviMaxNvObjects of 9 is invalid. Using default.  Value must be >= 10 and <= 100000",
         KVI_LOG_WARN_NUM},
        {"KviMaxNvObjects = \"100001\"\n", "KviMaxNvObjects of 100001 is invalid.",
         KVI_LOG_WARN_NUM},
        {"KviMaxNvObjects = \"-5\"\n", "KviMaxNvObjects of 4294967291 is invalid.",
         KVI_LOG_WARN_NUM},
        {"KviMaxNvObjects = \"99999999999\"\n", "KviMaxNvObjects of 4294967295 is invalid.",
         KVI_LOG_WARN_NUM},
        {"KviMaxNvObjects = \"many\"\n", "KviMaxNvObjects of 0 is invalid.", KVI_LOG_WARN_NUM},
        {"", "kviCsCfgDataGet returned failure on KviMaxNvObjects key. Using default value.",
         KVI_LOG_DBG_H_NUM},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.lines);
        ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        KviLogCapture log;
        ASSERT_EQ(start(c.lines), SA_OK);
        EXPECT_TRUE(loggedAt(log, c.level, c.message));
        EXPECT_EQ(put("k10", "v"), SA_ERR_HPI_OUT_OF_SPACE) << "the limit of 12 stays";
    }
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    ASSERT_EQ(start("KviMaxNvObjects = \"100000\"\n"), SA_OK);
    EXPECT_EQ(put("k10", "v"), SA_OK);
}

TEST_F(NvStoreTest, MoreFilesThanTheLimitFailInitialization)
{
    for (SaHpiUint32T i = 0; i < 11; ++i)
        plant(i, encode("k" + std::to_string(i), "v"));
    KviLogCapture log;
    EXPECT_EQ(start("KviMaxNvObjects = \"10\"\n"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("addNvObjectToList failed. rc=-1007"));
    EXPECT_EQ(sortedNames(dir).size(), 11u) << "files are never lost to a limit";
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(start("KviMaxNvObjects = \"20\"\n"), SA_OK);
    EXPECT_EQ(get("k10"), "v");
}

TEST_F(NvStoreTest, StorageDirectoryIsCreatedOrRefused)
{
    dir = tmp.file("nv/deeper");
    fs::create_directories(tmp.file("nv"));
    ASSERT_EQ(start(), SA_OK);
    EXPECT_TRUE(fs::is_directory(dir));
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);

    KviLogCapture log;
    dir = tmp.file("missing/parent");
    EXPECT_EQ(start(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not create directory " + dir + ". err=2("));

    dir = tmp.write("plainfile", "x");
    EXPECT_EQ(start(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains(dir + " exists but isn't a directory. "));
}

TEST_F(NvStoreTest, FinalizeForgetsTheListButKeepsTheFiles)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "v"), SA_OK);
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(sortedNames(dir), std::vector<std::string>{fileName(0)});
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    EXPECT_EQ(get("k"), "v");
}

// ---------------------------------------------------------------------------
// Damaged and foreign files

TEST_F(NvStoreTest, DamagedFilesAreDeletedAtInitialization)
{
    std::string good = encode("good", "data");
    std::string badCrc = good;
    badCrc.back() ^= 0x01;
    std::string badReserved = good; // the reserved bytes are covered by the CRC
    badReserved[10] = 'x';
    std::string keyPastEnd = encode("abcde", "");
    keyPastEnd[9] = 20;
    reseal(keyPastEnd);
    std::string tooSmall(8, '\0');
    putU32(tooSmall, 0, 8);
    std::string keyWithNul = encode(std::string("a\0b", 3), "data");

    struct Case {
        const char *what;
        std::string bytes;
        const char *message;
    } cases[] = {
        {"longer than its size", good + "x", "claims to be a different size than it actually is"},
        {"shorter than its size", good.substr(0, good.size() - 1), "claims to be a different size"},
        {"wrong crc", badCrc, "fails crc check. file crc=0x"},
        {"reserved bytes changed", badReserved, "fails crc check"},
        {"wrong version", encode("good", "data", 2), "Incorrect object version in file"},
        {"empty key", encode("", "data"), "nvKeyIsValid returned false for key from file"},
        {"30-byte key", encode(std::string(30, 'k'), "data"), "nvKeyIsValid returned false"},
        {"NUL in key", keyWithNul, "Found invalid character 0x00 in key. "},
        {"key past the end", keyPastEnd, "nvKeyIsValid returned false for key from file"},
        {"no room for a header", tooSmall, "is too small to hold an object header"},
    };
    for (SaHpiUint32T i = 0; i < std::size(cases); ++i)
        plant(i, cases[i].bytes);

    KviLogCapture log(KVI_LOG_INFO_NUM);
    ASSERT_EQ(start(), SA_OK);
    EXPECT_TRUE(sortedNames(dir).empty());
    for (SaHpiUint32T i = 0; i < std::size(cases); ++i) {
        SCOPED_TRACE(cases[i].what);
        EXPECT_TRUE(log.contains(cases[i].message));
        EXPECT_TRUE(loggedAt(log, KVI_LOG_INFO_NUM, "Attempting to delete " + objectPath(i)));
        EXPECT_TRUE(log.contains("Object file " + objectPath(i) + " is not valid."));
    }
    EXPECT_EQ(getRc("good"), SA_ERR_HPI_NOT_PRESENT);
}

TEST_F(NvStoreTest, UnreadableAndForeignFilesAreLeftAlone)
{
    std::string sound = encode("sound", "data");
    sound[10] = 'r'; // readers ignore the reserved bytes' content
    reseal(sound);
    plant(7, sound);
    plant(3, std::string("\x10\x00", 2));  // too short to hold its size
    fs::create_directories(objectPath(4)); // a directory under an object name
    std::string foreign[] = {"12", "000000001a", "00000000123", "4294967295", "9999999999"};
    for (const std::string &name : foreign)
        std::ofstream(dir + "/" + name, std::ios::binary) << encode("foreign", "x");

    KviLogCapture log;
    ASSERT_EQ(start(), SA_OK);
    EXPECT_EQ(get("sound"), "data");
    EXPECT_EQ(getRc("foreign"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(sortedNames(dir).size(), 8u);
    EXPECT_TRUE(
        log.contains("read failed to get size of object from file " + objectPath(3) + ". br=2"));
    EXPECT_TRUE(log.contains("read failed to get size of object from file " + objectPath(4)));
    for (const std::string &name : foreign)
        EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM, "Skipping file \"" + name + "\"")) << name;

    // A free number whose name a leftover holds is simply written over.
    ASSERT_EQ(put("a", "1"), SA_OK);
    ASSERT_EQ(put("b", "2"), SA_OK);
    ASSERT_EQ(put("c", "3"), SA_OK);
    ASSERT_EQ(put("d", "4"), SA_OK);
    EXPECT_EQ(readFile(objectPath(3)), encode("d", "4"));
}

TEST_F(NvStoreTest, OfTwoFilesWithOneKeyTheFirstInDirectoryOrderSurvives)
{
    plant(3, encode("twice", "three"));
    plant(8, encode("twice", "eight"));
    plant(5, encode("once", "five"));
    std::vector<std::string> order;
    for (const std::string &name : directoryOrder(dir))
        if (name != fileName(5))
            order.push_back(name);
    ASSERT_EQ(order.size(), 2u);

    KviLogCapture log;
    ASSERT_EQ(start(), SA_OK);
    EXPECT_EQ(get("twice"), order[0] == fileName(3) ? "three" : "eight");
    EXPECT_FALSE(fs::exists(dir + "/" + order[1]));
    EXPECT_TRUE(fs::exists(dir + "/" + order[0]));
    std::string survivor = order[0] == fileName(3) ? "3" : "8";
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM,
                         "Object file " + dir + "/" + order[1] +
                             " has a duplicate key twice as existing file number " + survivor +
                             ".  Attempting to delete it."));
    EXPECT_EQ(get("once"), "five");
}

TEST_F(NvStoreTest, GetDeletesADamagedFileAndForgetsItsKey)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "value"), SA_OK);
    ASSERT_EQ(put("other", "x"), SA_OK);
    std::string damaged = encode("k", "value");
    damaged[damaged.size() - 1] ^= 0x40;
    std::ofstream(objectPath(0), std::ios::binary) << damaged;

    KviLogCapture log;
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Object file " + objectPath(0) + " for key k is not valid."));
    EXPECT_FALSE(fs::exists(objectPath(0)));
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_NOT_PRESENT);

    // A file that vanished is invalid too, but nothing is deleted for it.
    fs::remove(objectPath(1));
    EXPECT_EQ(getRc("other"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("stat failed on file " + objectPath(1) + ". st=-1. errno=2("));
    EXPECT_EQ(getRc("other"), SA_ERR_HPI_NOT_PRESENT);
}

TEST_F(NvStoreTest, GetRefusesASoundFileThatHoldsAnotherKey)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("mine", "value"), SA_OK);
    // What a get sees when a put gave the number to another key after the
    // lookup: the file is sound, so it stays, but it is not this key's.
    std::ofstream(objectPath(0), std::ios::binary) << encode("theirs", "other");
    EXPECT_EQ(getRc("mine"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(fs::exists(objectPath(0)));
}

// ---------------------------------------------------------------------------
// Failing I/O and memory

TEST_F(NvStoreTest, FullDiskFailsThePutAndLosesNothing)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "old"), SA_OK);
    ASSERT_EQ(put("j", "kept"), SA_OK);

    KviLogCapture log;
    writeErrno = ENOSPC;
    kviCsNvFileOps.writeFile = failingWrite;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("write failed. bw=-1, errno=28("));
    EXPECT_EQ(put("fresh", "new"), SA_ERR_HPI_OUT_OF_SPACE);
    writeErrno = EIO;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_ERROR);

    openErrno = ENOSPC;
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    kviCsNvFileOps.openFile = failingCreate;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Could not open \"" + objectPath(2) + "\". errno=28("));
    openErrno = EACCES;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_ERROR);

    // Half an object reaches the disk; the next start discards it.
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    kviCsNvFileOps.writeFile = halfWrite;
    EXPECT_EQ(put("k", "new but long enough to be cut in half"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_GE(fs::file_size(objectPath(2)), 4u);

    kviCsNvFileOps = kviCsNvDefaultFileOps;
    EXPECT_EQ(get("k"), "old");
    EXPECT_EQ(getRc("fresh"), SA_ERR_HPI_NOT_PRESENT);
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("k"), "old");
    EXPECT_EQ(get("j"), "kept");
    EXPECT_FALSE(fs::exists(objectPath(2)));
}

TEST_F(NvStoreTest, AllocationFailuresLeaveTheStoreAsItWas)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "old"), SA_OK);
    const SaHpiInt32T live = kviTestLiveBlocks();

    // Put takes a path and the object; any of them may fail.
    for (SaHpiInt32T nth = 1;; ++nth) {
        SCOPED_TRACE(nth);
        kviCsMemoryFailNthAllocation(nth);
        SaErrorT rc = put("k", "new");
        kviCsMemoryFailNthAllocation(0);
        EXPECT_EQ(kviTestLiveBlocks(), live);
        if (rc == SA_OK)
            break;
        EXPECT_EQ(rc, SA_ERR_HPI_ERROR);
        EXPECT_EQ(get("k"), "old");
        EXPECT_EQ(sortedNames(dir), std::vector<std::string>{fileName(0)});
        ASSERT_LT(nth, 10);
    }
    EXPECT_EQ(get("k"), "new");

    KviLogCapture log;
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsNonVolatileDelete("k"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not allocate space for filePath"));
    EXPECT_EQ(get("k"), "new");

    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_ERROR);
    EXPECT_EQ(get("k"), "new") << "a failed path leaves the entry";
    // Without memory for the object the file counts as invalid: the entry
    // goes, the file stays and comes back at the next start.
    kviCsMemoryFailNthAllocation(2);
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("KVI_CS_MALLOC failed to get 16 bytes for " + objectPath(1) + "."));
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviTestLiveBlocks(), live);
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("k"), "new");
}

TEST_F(NvStoreTest, AllocationFailuresAtInitializationLeakNothing)
{
    plant(0, encode("k", "v"));
    configure();
    const SaHpiInt32T live = kviTestLiveBlocks();
    KviLogCapture log;

    kviCsMemoryFailNthAllocation(1); // the directory's name
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM,
                         "KVI_CS_MALLOC failed: " + std::to_string(dir.size() + 1) +
                             " bytes for ipmi driver name."));
    EXPECT_EQ(kviTestLiveBlocks(), live);

    kviCsMemoryFailNthAllocation(2); // the file's path
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Could not allocate space for filePath"));
    EXPECT_EQ(kviTestLiveBlocks(), live);

    kviCsMemoryFailNthAllocation(3); // the object: the file is passed over, not deleted
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    kviCsMemoryFailNthAllocation(0);
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(fs::exists(objectPath(0)));
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), live);

    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    EXPECT_EQ(get("k"), "v");
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), live);
}

// ---------------------------------------------------------------------------
// Locks

TEST_F(NvStoreTest, ABusyListLockFailsTheCallAndReleasesWhatWasHeld)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "v"), SA_OK);
    KviLogCapture log;
    ASSERT_EQ(KVI_CS_SEM_TRYWAIT(kviCsNvListSemaphore()), SA_OK);
    char buffer[30];
    SaHpiUint32T count = 0;
    EXPECT_EQ(put("k", "w"), SA_ERR_HPI_ERROR);
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_ERROR);
    EXPECT_EQ(kviCsNonVolatileDelete("k"), SA_ERR_HPI_ERROR);
    EXPECT_EQ(kviCsNonVolatileFind("k", sizeof buffer, buffer, &count), SA_ERR_HPI_ERROR);
    EXPECT_EQ(log.matching("KVI_CS_SEM_WAIT failed. rc=-1006").size(), 4u);
    // The file lock taken before the list lock was given back.
    ASSERT_EQ(KVI_CS_SEM_TRYWAIT(kviCsNvDeleteSemaphore()), SA_OK);
    ASSERT_EQ(KVI_CS_SEM_POST(kviCsNvDeleteSemaphore()), SA_OK);

    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_ERR_HPI_ERROR);
    ASSERT_EQ(KVI_CS_SEM_POST(kviCsNvListSemaphore()), SA_OK);
    // That finalize still ended the store; a new start frees what it left.
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_UNINITIALIZED);
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    EXPECT_EQ(get("k"), "v");
}

TEST_F(NvStoreTest, WritersWaitASecondForTheFileLock)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(KVI_CS_SEM_TRYWAIT(kviCsNvDeleteSemaphore()), SA_OK);
    auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(put("k", "v"), SA_ERR_HPI_ERROR);
    auto waited = std::chrono::steady_clock::now() - begin;
    EXPECT_GE(waited, std::chrono::milliseconds(900));
    EXPECT_LT(waited, std::chrono::seconds(5));
    ASSERT_EQ(KVI_CS_SEM_POST(kviCsNvDeleteSemaphore()), SA_OK);
    EXPECT_EQ(put("k", "v"), SA_OK);
}

TEST_F(NvStoreTest, ReadersAndWritersOfOneKeyNeverSeeForeignData)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("shared", "value-0"), SA_OK);
    std::atomic<bool> stop{false};
    std::atomic<int> wrong{0};
    std::atomic<int> busy{0};
    // The list lock is waited for 10 ms only; a put that meets a busy list
    // fails and is tried again.
    auto retryingPut = [&](const std::string &key, const std::string &data) {
        for (int attempt = 0; attempt < 100; ++attempt) {
            SaErrorT rc = put(key, data);
            if (rc != SA_ERR_HPI_ERROR)
                return rc;
            ++busy;
        }
        return SA_ERR_HPI_ERROR;
    };
    std::vector<std::thread> threads;
    for (int t = 0; t < 2; ++t)
        threads.emplace_back([&] {
            while (!stop) {
                SaErrorT rc = SA_OK;
                std::string value = get("shared", &rc);
                // A get that races the replacement may find the old file gone.
                if (rc == SA_ERR_HPI_DATA_TRUNCATED ? value.rfind("value-", 0) != 0
                                                    : rc != SA_ERR_HPI_ERROR)
                    ++wrong;
                std::this_thread::sleep_for(std::chrono::microseconds(50));
            }
        });
    threads.emplace_back([&] {
        for (int i = 0; i < 100; ++i)
            if (retryingPut("other" + std::to_string(i % 5), "noise") != SA_OK)
                ++wrong;
    });
    for (int i = 1; i <= 100; ++i)
        if (retryingPut("shared", "value-" + std::to_string(i)) != SA_OK)
            ++wrong;
    stop = true;
    for (auto &t : threads)
        t.join();
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(get("shared"), "value-100");
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("shared"), "value-100");
    EXPECT_EQ(sortedNames(dir).size(), 6u) << busy << " puts met a busy list";
}

// ---------------------------------------------------------------------------
// Fatal paths

using NvStoreDeathTest = NvStoreTest;

TEST_F(NvStoreDeathTest, MissingStorageDirectoryEndsTheProcess)
{
    ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, tmp.write("empty.conf", "other = \"1\"\n").c_str()),
              SA_OK);
    KviLogCapture log;
    EXPECT_EXIT(kviCsNonVolatileInitialize(), testing::ExitedWithCode(1), "");
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM,
                         "kviCsCfgDataGet returned failure on KviNvStorageDir key. exiting."));
    kviCsConfigFinalize();
}

TEST_F(NvStoreDeathTest, ListWithoutItsLockOrMemoryEndsTheProcess)
{
    ASSERT_EQ(start(), SA_OK);
    KviLogCapture log;
    EXPECT_EXIT(findNvObjectInList("k", 1), testing::ExitedWithCode(1), "");
    EXPECT_EXIT(findNvObjectInListByFileNumber(0), testing::ExitedWithCode(1), "");
    EXPECT_EXIT(deleteNvObjectFromList(0, SAHPI_FALSE), testing::ExitedWithCode(1), "");
    EXPECT_EQ(log.matching("NvObjectListSem was not locked").size(), 3u);

    // The first put grows the empty list; without memory for it there is no
    // way on.
    EXPECT_EXIT(
        {
            kviCsMemoryFailNthAllocation(1);
            put("k", "v");
        },
        testing::ExitedWithCode(1), "");
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM,
                         "KVI_CS_REALLOC failed to get " +
                             std::to_string(10 * sizeof(NvListItemT)) + " bytes for object list."));
}

} // namespace
