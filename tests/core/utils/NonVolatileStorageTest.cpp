#include "core/utils/NonVolatileStorage.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <chrono>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <functional>
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
using Names = std::vector<std::string>;

void putU32(std::string &bytes, size_t offset, SaHpiUint32T value)
{
    memcpy(bytes.data() + offset, &value, sizeof value);
}

// The object with its CRC recomputed over everything after the Crc field.
std::string resealed(std::string object)
{
    putU32(object, 4, kviCsCrcGen(object.data() + 8, static_cast<SaHpiInt32T>(object.size() - 8)));
    return object;
}

// An object file built by hand, byte for byte as the store lays it out.
std::string encode(const std::string &key, const std::string &data, char version = 1)
{
    std::string header(12, '\0');
    putU32(header, 0, static_cast<SaHpiUint32T>(12 + key.size() + data.size()));
    header[8] = version;
    header[9] = static_cast<char>(key.size());
    return resealed(header + key + data);
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

// The directory's names, sorted or in the order the store meets them.
Names namesIn(const std::string &dir, bool sorted = true)
{
    Names names;
    std::error_code ec;
    for (const auto &entry : fs::directory_iterator(dir, ec))
        names.push_back(entry.path().filename().string());
    if (sorted)
        std::sort(names.begin(), names.end());
    return names;
}

// A line with the text at the level, which the logger writes as three digits
// after the level's label.
bool loggedAt(const KviLogCapture &log, SaHpiUint32T level, const std::string &text)
{
    char tag[8];
    snprintf(tag, sizeof tag, " %3.3u ", level);
    Names lines = log.matching(text);
    return std::any_of(lines.begin(), lines.end(),
                       [&](const std::string &line) { return line.find(tag) < line.find("Pid:"); });
}

// What the I/O seams of a test record or inject.
std::string seamDir;
std::vector<Names> namesAtUnlink;
int seamErrno = 0;
int createFlags = 0;
mode_t createMode = 0;

class NvStoreTest : public testing::Test
{
  protected:
    void SetUp() override { baseline_ = kviTestLiveBlocks(); }
    void TearDown() override
    {
        kviCsNvFileOps = kviCsNvDefaultFileOps;
        kviCsMemoryFailNthAllocation(0);
        kviCsNonVolatileFinalize();
        if (configured_)
            kviCsConfigFinalize();
        EXPECT_EQ(kviTestLiveBlocks(), baseline_) << "blocks leaked";
    }

    // Configures the storage directory and the lines given, then starts the
    // store. The object limit is always set: the store keeps an earlier
    // initialization's value when the key is missing.
    SaErrorT start(const std::string &lines = "KviMaxNvObjects = \"1000\"\n", bool init = true)
    {
        if (configured_)
            kviCsConfigFinalize();
        std::string text = "KviNvStorageDir = \"" + dir + "\"\n" + lines;
        configured_ = kviCsConfigInit(SAHPI_FALSE, tmp.write("nv.conf", text).c_str()) == SA_OK;
        EXPECT_TRUE(configured_);
        return init ? kviCsNonVolatileInitialize() : SA_OK;
    }
    static SaErrorT restart()
    {
        EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        return kviCsNonVolatileInitialize();
    }
    static SaErrorT put(const std::string &key, const std::string &data)
    {
        return kviCsNonVolatilePut(key.c_str(), static_cast<SaHpiUint32T>(data.size()),
                                   data.data());
    }
    // The code of a get of the whole object; the data read lands in *value.
    static SaErrorT getRc(const std::string &key, std::string *value = nullptr)
    {
        char buffer[4096];
        SaHpiUint32T bytesRead = 0;
        SaErrorT rc = kviCsNonVolatileGet(key.c_str(), 0, sizeof buffer, buffer, &bytesRead);
        if (value != nullptr)
            value->assign(buffer, bytesRead);
        return rc;
    }
    static std::string get(const std::string &key)
    {
        std::string value;
        EXPECT_EQ(getRc(key, &value), SA_ERR_HPI_DATA_TRUNCATED) << "get " << key;
        return value;
    }
    std::string path(SaHpiUint32T number) const { return dir + "/" + fileName(number); }
    void plant(SaHpiUint32T number, const std::string &bytes) const
    {
        fs::create_directories(dir);
        std::ofstream(path(number), std::ios::binary) << bytes;
    }

    KviTempDir tmp;
    std::string dir = tmp.file("nv");

  private:
    SaHpiInt32T baseline_ = 0;
    bool configured_ = false;
};

// Files on disk

TEST_F(NvStoreTest, PutWritesTheObjectByteForByteToASynchronousMode0600File)
{
    ASSERT_EQ(start(), SA_OK);
    kviCsNvFileOps.openFile = [](const char *name, int flags, mode_t mode) {
        if ((flags & O_CREAT) != 0) {
            createFlags = flags;
            createMode = mode;
        }
        return open(name, flags, mode);
    };
    const std::string data("\x01\x02\x00\xfe\x05", 5);
    ASSERT_EQ(put("abc", data), SA_OK);
    // Size, CRC-32/BZIP2 of bytes 8 on, version, key length, reserved zeros,
    // key, data; integers in the host's (little-endian) order.
    const std::string expected("\x14\0\0\0"
                               "\xd9\x60\x59\x6c"
                               "\x01\x03\0\0"
                               "abc"
                               "\x01\x02\x00\xfe\x05",
                               20);
    EXPECT_EQ(readFile(path(0)), expected);
    EXPECT_EQ(encode("abc", data), expected);
    EXPECT_EQ(createFlags & (O_ACCMODE | O_CREAT | O_TRUNC | O_SYNC),
              O_RDWR | O_CREAT | O_TRUNC | O_SYNC);
    EXPECT_EQ(createMode, 0600u);
    struct stat status {
    };
    ASSERT_EQ(stat(path(0).c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 0777, 0600u);
}

TEST_F(NvStoreTest, ObjectsSurviveARestartAndEveryGetReadsTheDisk)
{
    ASSERT_EQ(start(), SA_OK);
    KviLogCapture log;
    EXPECT_EQ(kviCsNonVolatileInitialize(), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "NV storage is already initialized."));
    ASSERT_EQ(put("one", "first"), SA_OK);
    ASSERT_EQ(put("two", std::string(3000, 'x')), SA_OK);
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(getRc("one"), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(namesIn(dir), (Names{fileName(0), fileName(1)})) << "finalize keeps the files";
    ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    EXPECT_EQ(get("one"), "first");
    EXPECT_EQ(get("two"), std::string(3000, 'x'));
    // No cache: a file changed behind the store's back is what get returns.
    plant(0, encode("one", "changed"));
    EXPECT_EQ(get("one"), "changed");
}

TEST_F(NvStoreTest, ReplacingWritesTheLowestFreeNumberBeforeRemovingTheOldFile)
{
    ASSERT_EQ(start(), SA_OK);
    for (const char *key : {"k0", "k1", "k2"})
        ASSERT_EQ(put(key, "v"), SA_OK);
    seamDir = dir;
    kviCsNvFileOps.unlinkFile = [](const char *name) {
        namesAtUnlink.push_back(namesIn(seamDir));
        return unlink(name);
    };
    ASSERT_EQ(put("k0", "new"), SA_OK);
    // When the old file went, the new one was already complete.
    EXPECT_EQ(namesAtUnlink,
              (std::vector<Names>{{fileName(0), fileName(1), fileName(2), fileName(3)}}));
    EXPECT_EQ(namesIn(dir), (Names{fileName(1), fileName(2), fileName(3)}));
    EXPECT_EQ(readFile(path(3)), encode("k0", "new"));
    ASSERT_EQ(put("k3", "d"), SA_OK);
    EXPECT_EQ(readFile(path(0)), encode("k3", "d"));
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
    for (SaHpiUint32T i = 0; i < 4100; ++i)
        ASSERT_EQ(i == 4097 ? SA_OK : add(i, SAHPI_TRUE), SA_OK); // 4097 stays free
    EXPECT_EQ(lowestFreeObjectNumber(), 4097u);
    ASSERT_EQ(add(4097, SAHPI_TRUE), SA_OK);
    ASSERT_EQ(add(4100, SAHPI_FALSE), SA_OK); // a put in progress does not count
    EXPECT_EQ(lowestFreeObjectNumber(), 4100u);
    EXPECT_EQ(findNvObjectInListByFileNumber(4100), NV_INVALID_LIST_ENTRY);
    ASSERT_EQ(KVI_CS_SEM_POST(kviCsNvListSemaphore()), SA_OK);
}

TEST_F(NvStoreTest, DeleteRemovesTheEntryEvenWhenTheFileStays)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("gone", "x"), SA_OK);
    ASSERT_EQ(put("kept", "y"), SA_OK);
    EXPECT_EQ(kviCsNonVolatileDelete("gone"), SA_OK);
    EXPECT_EQ(kviCsNonVolatileDelete("gone"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(getRc("gone"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(namesIn(dir), Names{fileName(1)});

    // The next start finds a file that could not be unlinked again.
    KviLogCapture log;
    kviCsNvFileOps.unlinkFile = [](const char *) {
        errno = EACCES;
        return -1;
    };
    EXPECT_EQ(kviCsNonVolatileDelete("kept"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Could not delete object file " + path(1) + ". err=13("));
    EXPECT_EQ(getRc("kept"), SA_ERR_HPI_NOT_PRESENT);
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("kept"), "y");
}

// Arguments

TEST_F(NvStoreTest, ArgumentsAndKeysAreCheckedBeforeTheState)
{
    char buffer[8];
    SaHpiUint32T count = 0;
    const std::string key30(30, 'k');
    const std::string key256(256, 'k');
    // Not even initialized yet: the argument checks come first.
    const struct {
        const char *message;
        std::function<SaErrorT()> call;
    } cases[] = {
        {"BytesToWrite of 0 is not valid",
         [&] { return kviCsNonVolatilePut(nullptr, 0, nullptr); }},
        {"BytesToWrite of 2147483647 is not valid",
         [&] { return kviCsNonVolatilePut("k", 0x7FFFFFFF, buffer); }},
        {"Key pointer is NULL.", [&] { return kviCsNonVolatileDelete(nullptr); }},
        {"Buffer pointer is NULL.", [&] { return kviCsNonVolatilePut("k", 1, nullptr); }},
        {"BytesRead pointer is NULL.",
         [&] { return kviCsNonVolatileGet("k", 0, 1, buffer, nullptr); }},
        {"BufferSizeReqd pointer is NULL.",
         [&] { return kviCsNonVolatileFind("k", 0, buffer, nullptr); }},
        {"Invalid KeyLen. kl=0, max is 29", [&] { return kviCsNonVolatileDelete(""); }},
        {"Invalid KeyLen. kl=30, max is 29", [&] { return put(key30, "v"); }},
        {"nvKeyIsValid returned false for key kkkkkkkkkk", [&] { return put(key30, "v"); }},
        {"Invalid KeyLen. kl=0, max is 29", [&] { return put(key256, "v"); }},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.message);
        KviLogCapture log;
        EXPECT_EQ(c.call(), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_TRUE(log.contains(c.message));
    }
    KviLogCapture log;
    EXPECT_EQ(kviCsNonVolatilePut("k", 1, buffer), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileGet("k", 0, 1, buffer, &count), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileDelete("k"), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileFind("k", 8, buffer, &count), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(log.matching("NV storage is not initialized.").size(), 5u);

    // 29 bytes pass; the length travels in 8 bits, so 257 pass as 1.
    ASSERT_EQ(start(), SA_OK);
    EXPECT_EQ(put(std::string(29, 'k'), "ok"), SA_OK);
    EXPECT_EQ(put("q" + key256, "wrapped"), SA_OK);
    EXPECT_EQ(get("q"), "wrapped");
    EXPECT_EQ(get(std::string(29, 'k')), "ok");
}

TEST_F(NvStoreTest, GetCopiesWhatExistsFromTheOffset)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "0123456789"), SA_OK);
    const struct {
        const char *key;
        SaHpiUint32T offset, count;
        SaErrorT rc;
        const char *data;
        SaHpiUint32T level;
        const char *message;
    } cases[] = {
        {"k", 2, 5, SA_OK, "23456", 0, nullptr},
        {"k", 0, 10, SA_OK, "0123456789", 0, nullptr},
        {"k", 7, 5, SA_ERR_HPI_DATA_TRUNCATED, "789", KVI_LOG_DBG_H_NUM,
         "does not have enough data to fulfill request.  objectSize=10, ObjectOffset=7, "
         "BytesToRead=5"},
        {"k", 10, 1, SA_ERR_HPI_DATA_TRUNCATED, "", KVI_LOG_DBG_H_NUM,
         "does not have any data to fulfill request.  objectSize=10, ObjectOffset=10"},
        {"k", 0xFFFFFFFF, 0xFFFFFFFF, SA_ERR_HPI_DATA_TRUNCATED, "", KVI_LOG_DBG_H_NUM,
         "ObjectOffset=4294967295"},
        {"k", 0, 0, SA_ERR_HPI_INVALID_PARAMS, "", KVI_LOG_ERR_NONFATAL_NUM, "BytesToRead is zero"},
        {"none", 0, 1, SA_ERR_HPI_NOT_PRESENT, "", KVI_LOG_DBG_H_NUM, "Key none does not exist."},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(std::string(c.key) + " from " + std::to_string(c.offset));
        KviLogCapture log;
        char buffer[16] = {};
        SaHpiUint32T bytesRead = 99;
        EXPECT_EQ(kviCsNonVolatileGet(c.key, c.offset, c.count, buffer, &bytesRead), c.rc);
        EXPECT_EQ(std::string(buffer, bytesRead), c.data);
        EXPECT_TRUE(c.message == nullptr || loggedAt(log, c.level, c.message));
    }
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
    const std::string pad(17, '\0');
    EXPECT_EQ(buffer, "kviResTag0002" + pad + "kviResTag0001" + pad + std::string(40, '#'));

    // Slots that fit are filled; the rest is only counted.
    buffer.assign(100, '#');
    KviLogCapture log;
    EXPECT_EQ(kviCsNonVolatileFind("kviRes", 59, buffer.data(), &needed),
              SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(needed, 90u);
    EXPECT_EQ(buffer, "kviResSev0001" + pad + std::string(70, '#'));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM,
                         "Caller provided Buffer of size 59 was too small.  Needed 90."));
    EXPECT_EQ(kviCsNonVolatileFind("kviRes", 0, buffer.data(), &needed), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(needed, 90u);
}

// Configuration and limits

TEST_F(NvStoreTest, MaxObjectsLimitsTheListInWholeIncrementsAndNeverCostsAFile)
{
    KviLogCapture log;
    ASSERT_EQ(start("KviMaxNvObjects = \"15abc\"\n"), SA_OK); // trailing characters ignored
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

    // Invalid values, read as the 32-bit strtoul reads them (a minus negates,
    // overflow saturates), and a missing key keep the limit in force.
    const std::pair<const char *, const char *> invalid[] = {{"9", "9"},
                                                             {"100001", "100001"},
                                                             {"-5", "4294967291"},
                                                             {"99999999999", "4294967295"},
                                                             {"many", "0"}};
    for (const auto &[value, read] : invalid) {
        SCOPED_TRACE(value);
        ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        ASSERT_EQ(start("KviMaxNvObjects = \"" + std::string(value) + "\"\n"), SA_OK);
        EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM,
                             "KviMaxNvObjects of " + std::string(read) +
                                 " is invalid. Using default.  Value must be >= 10 and <= 100000"));
        EXPECT_EQ(put("k10", "v"), SA_ERR_HPI_OUT_OF_SPACE);
    }
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    ASSERT_EQ(start(""), SA_OK);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_H_NUM,
                 "kviCsCfgDataGet returned failure on KviMaxNvObjects key. Using default value."));
    EXPECT_EQ(put("k10", "v"), SA_ERR_HPI_OUT_OF_SPACE);

    // More files than the limit fail the start, and all of them stay.
    plant(10, encode("k10", "v"));
    ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(start("KviMaxNvObjects = \"10\"\n"), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Using KviMaxNvObjects value of 10."));
    EXPECT_TRUE(log.contains("addNvObjectToList failed. rc=-1007"));
    EXPECT_EQ(namesIn(dir).size(), 11u);
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_ERR_HPI_UNINITIALIZED);
    EXPECT_EQ(start("KviMaxNvObjects = \"100000\"\n"), SA_OK);
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

// Damaged and foreign files

TEST_F(NvStoreTest, InitializationDeletesDamagedFilesAndLeavesUnreadableAndForeignOnes)
{
    const std::string good = encode("good", "data");
    std::string badCrc = good;
    badCrc.back() ^= 0x01;
    std::string badReserved = good; // the reserved bytes are covered by the CRC
    badReserved[10] = 'x';
    std::string keyPastEnd = encode("abcde", "");
    keyPastEnd[9] = 20;
    std::string tooSmall(8, '\0');
    putU32(tooSmall, 0, 8);
    // Planted as files 10, 11, ...: the wrong CRC sits in 0000000012.
    const struct {
        const char *what;
        std::string bytes;
        const char *message;
    } damaged[] = {
        {"longer than its size", good + "x", "claims to be a different size than it actually is"},
        {"shorter than its size", good.substr(0, good.size() - 1), "claims to be a different size"},
        {"wrong crc", badCrc, "fails crc check. file crc=0x"},
        {"reserved bytes changed", badReserved, "fails crc check"},
        {"wrong version", encode("good", "data", 2), "Incorrect object version in file"},
        {"empty key", encode("", "data"), "nvKeyIsValid returned false for key from file"},
        {"30-byte key", encode(std::string(30, 'k'), "data"), "nvKeyIsValid returned false"},
        {"NUL in key", encode(std::string("a\0b", 3), "data"), "Found invalid character 0x00"},
        {"key past the end", resealed(keyPastEnd), "nvKeyIsValid returned false for key from"},
        {"no room for a header", tooSmall, "is too small to hold an object header"},
    };
    for (SaHpiUint32T i = 0; i < std::size(damaged); ++i)
        plant(10 + i, damaged[i].bytes);
    std::string sound = encode("sound", "data");
    sound[10] = 'r'; // readers ignore the reserved bytes' content
    plant(7, resealed(sound));
    plant(3, std::string("\x10\x00", 2)); // too short to hold its size
    fs::create_directories(path(4));      // a directory under an object name
    const Names foreign = {"00000000123", "000000001a", "12", "4294967295", "9999999999"};
    for (const std::string &name : foreign)
        std::ofstream(dir + "/" + name, std::ios::binary) << encode("foreign", "x");

    KviLogCapture log;
    ASSERT_EQ(start(), SA_OK);
    Names left = foreign;
    left.insert(left.begin(), {fileName(3), fileName(4), fileName(7)});
    EXPECT_EQ(namesIn(dir), left);
    for (SaHpiUint32T i = 0; i < std::size(damaged); ++i) {
        SCOPED_TRACE(damaged[i].what);
        EXPECT_TRUE(log.contains(damaged[i].message));
        EXPECT_TRUE(loggedAt(log, KVI_LOG_INFO_NUM, "Attempting to delete " + path(10 + i)));
        EXPECT_TRUE(log.contains("Object file " + path(10 + i) + " is not valid."));
    }
    EXPECT_EQ(getRc("good"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(get("sound"), "data");
    EXPECT_EQ(getRc("foreign"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("read failed to get size of object from file " + path(3) + ". br=2"));
    EXPECT_TRUE(log.contains("read failed to get size of object from file " + path(4)));
    for (const std::string &name : foreign)
        EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM, "Skipping file \"" + name + "\"")) << name;
    // A free number whose name a leftover holds is simply written over.
    for (const char *key : {"a", "b", "c", "d"})
        ASSERT_EQ(put(key, key), SA_OK);
    EXPECT_EQ(readFile(path(3)), encode("d", "d"));
}

TEST_F(NvStoreTest, OfTwoFilesWithOneKeyTheFirstInDirectoryOrderSurvives)
{
    plant(3, encode("twice", "three"));
    plant(8, encode("twice", "eight"));
    plant(5, encode("once", "five"));
    Names order = namesIn(dir, false);
    order.erase(std::find(order.begin(), order.end(), fileName(5)));
    const bool threeFirst = order[0] == fileName(3);

    KviLogCapture log;
    ASSERT_EQ(start(), SA_OK);
    EXPECT_EQ(get("twice"), threeFirst ? "three" : "eight");
    EXPECT_EQ(get("once"), "five");
    EXPECT_EQ(namesIn(dir), (Names{fileName(5), order[0]}));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM,
                         "Object file " + dir + "/" + order[1] +
                             " has a duplicate key twice as existing file number " +
                             (threeFirst ? "3" : "8") + ".  Attempting to delete it."));
}

TEST_F(NvStoreTest, GetDropsTheKeyOfADamagedMissingOrForeignFile)
{
    ASSERT_EQ(start(), SA_OK);
    for (const char *key : {"k", "other", "mine"})
        ASSERT_EQ(put(key, "value"), SA_OK);
    std::string damaged = encode("k", "value");
    damaged.back() ^= 0x40;
    plant(0, damaged);
    fs::remove(path(1));
    // What a get sees when a put gave the number to another key after the
    // lookup: the file is sound, so it stays, but it is not this key's.
    plant(2, encode("theirs", "other"));

    KviLogCapture log;
    for (const char *key : {"k", "other", "mine"}) {
        SCOPED_TRACE(key);
        EXPECT_EQ(getRc(key), SA_ERR_HPI_ERROR);
        EXPECT_EQ(getRc(key), SA_ERR_HPI_NOT_PRESENT);
    }
    EXPECT_TRUE(log.contains("Object file " + path(0) + " for key k is not valid."));
    EXPECT_TRUE(log.contains("stat failed on file " + path(1) + ". st=-1. errno=2("));
    EXPECT_EQ(namesIn(dir), Names{fileName(2)});
}

// Failing I/O and memory

TEST_F(NvStoreTest, FullDiskFailsThePutAndLosesNothing)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "old"), SA_OK);
    ASSERT_EQ(put("j", "kept"), SA_OK);
    KviLogCapture log;
    kviCsNvFileOps.writeFile = [](int, const void *, size_t) -> ssize_t {
        errno = seamErrno;
        return -1;
    };
    seamErrno = ENOSPC;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("write failed. bw=-1, errno=28("));
    EXPECT_EQ(put("fresh", "new"), SA_ERR_HPI_OUT_OF_SPACE);
    seamErrno = EIO;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_ERROR);

    kviCsNvFileOps = kviCsNvDefaultFileOps;
    kviCsNvFileOps.openFile = [](const char *name, int flags, mode_t mode) {
        errno = seamErrno;
        return (flags & O_CREAT) == 0 ? open(name, flags, mode) : -1;
    };
    seamErrno = ENOSPC;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Could not open \"" + path(2) + "\". errno=28("));
    seamErrno = EACCES;
    EXPECT_EQ(put("k", "new"), SA_ERR_HPI_ERROR);

    // Half an object reaches the disk; the next start discards it.
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    kviCsNvFileOps.writeFile = [](int fd, const void *buffer, size_t count) {
        ssize_t written = write(fd, buffer, count / 2);
        errno = ENOSPC;
        return written;
    };
    EXPECT_EQ(put("k", "new but long enough to be cut in half"), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_GE(fs::file_size(path(2)), 4u);
    kviCsNvFileOps = kviCsNvDefaultFileOps;
    EXPECT_EQ(get("k"), "old");
    EXPECT_EQ(getRc("fresh"), SA_ERR_HPI_NOT_PRESENT);
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("k"), "old");
    EXPECT_EQ(get("j"), "kept");
    EXPECT_FALSE(fs::exists(path(2)));
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
        EXPECT_EQ(namesIn(dir), Names{fileName(0)});
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
    EXPECT_TRUE(log.contains("KVI_CS_MALLOC failed to get 16 bytes for " + path(1) + "."));
    EXPECT_EQ(getRc("k"), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviTestLiveBlocks(), live);
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("k"), "new");
}

TEST_F(NvStoreTest, AllocationFailuresAtInitializationLeakNothing)
{
    plant(0, encode("k", "v"));
    ASSERT_EQ(start("KviMaxNvObjects = \"1000\"\n", false), SA_OK);
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
    EXPECT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("k"), "v");
    EXPECT_EQ(kviCsNonVolatileFinalize(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), live);
}

// Locks

TEST_F(NvStoreTest, ABusyLockFailsTheCallAndReleasesWhatWasHeld)
{
    ASSERT_EQ(start(), SA_OK);
    ASSERT_EQ(put("k", "v"), SA_OK);
    // Writers wait a second for the file lock.
    ASSERT_EQ(KVI_CS_SEM_TRYWAIT(kviCsNvDeleteSemaphore()), SA_OK);
    auto begin = std::chrono::steady_clock::now();
    EXPECT_EQ(put("k", "w"), SA_ERR_HPI_ERROR);
    auto waited = std::chrono::steady_clock::now() - begin;
    EXPECT_GE(waited, std::chrono::milliseconds(900));
    EXPECT_LT(waited, std::chrono::seconds(5));
    ASSERT_EQ(KVI_CS_SEM_POST(kviCsNvDeleteSemaphore()), SA_OK);

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
        SaErrorT rc = put(key, data);
        for (int attempt = 1; attempt < 100 && rc == SA_ERR_HPI_ERROR; ++attempt, ++busy)
            rc = put(key, data);
        wrong += rc != SA_OK ? 1 : 0;
    };
    std::vector<std::thread> threads;
    for (int t = 0; t < 2; ++t)
        threads.emplace_back([&] {
            while (!stop) {
                std::string value;
                SaErrorT rc = getRc("shared", &value);
                // A get that races the replacement may find the old file gone.
                if (rc == SA_ERR_HPI_DATA_TRUNCATED ? value.rfind("value-", 0) != 0
                                                    : rc != SA_ERR_HPI_ERROR)
                    ++wrong;
                std::this_thread::sleep_for(std::chrono::microseconds(50));
            }
        });
    threads.emplace_back([&] {
        for (int i = 0; i < 100; ++i)
            retryingPut("other" + std::to_string(i % 5), "noise");
    });
    for (int i = 1; i <= 100; ++i)
        retryingPut("shared", "value-" + std::to_string(i));
    stop = true;
    for (auto &t : threads)
        t.join();
    EXPECT_EQ(wrong, 0);
    EXPECT_EQ(get("shared"), "value-100");
    ASSERT_EQ(restart(), SA_OK);
    EXPECT_EQ(get("shared"), "value-100");
    EXPECT_EQ(namesIn(dir).size(), 6u) << busy << " puts met a busy list";
}

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
