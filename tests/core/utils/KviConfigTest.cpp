// Queries, containers, change callbacks and the watcher thread of the
// configuration unit.
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstring>
#include <functional>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include <sys/time.h>

#include "core/utils/KviConfig.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
using Clock = std::chrono::steady_clock;
using namespace std::chrono_literals;

long long msSince(Clock::time_point start)
{
    return std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start).count();
}

// Moves a file's modification time by whole seconds: a change the watcher
// sees at once, without waiting for the clock's next second.
void shiftModificationTime(const std::string &path, long seconds)
{
    SaHpiInt64T modified = 0;
    ASSERT_EQ(kviCsGetFileInfo(path.c_str(), &modified, nullptr), SA_OK);
    struct timeval times[2];
    times[0].tv_sec = times[1].tv_sec = static_cast<time_t>(modified / 1000000000LL) + seconds;
    times[0].tv_usec = times[1].tv_usec = 0;
    ASSERT_EQ(utimes(path.c_str(), times), 0);
}

bool waitFor(const std::function<bool()> &done, std::chrono::milliseconds limit)
{
    auto deadline = Clock::now() + limit;
    while (!done()) {
        if (Clock::now() > deadline)
            return false;
        std::this_thread::sleep_for(10ms);
    }
    return true;
}

// Finalization refuses a container whose callbacks are running at that very
// moment (a watcher that reloads every second), and the caller tries again.
SaErrorT finalizeWhenIdle(KviCsCfgContainer *container)
{
    SaErrorT rc = SA_OK;
    for (int attempt = 0; attempt < 50; ++attempt) {
        rc = kviCsConfigFinalizeStrucure(container);
        if (rc != SA_ERR_HPI_INVALID_REQUEST)
            break;
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    return rc;
}

// A container loaded from a file of its own.
class ContainerTest : public testing::Test
{
  protected:
    void load(const std::string &text, SaHpiBoolT watch = SAHPI_FALSE)
    {
        path_ = dir_.write("kvi.conf", text);
        ASSERT_EQ(kviCsConfigInitStructure(&cont_, watch, path_.c_str()), SA_OK);
        loaded_ = true;
    }
    void TearDown() override
    {
        if (loaded_) {
            EXPECT_EQ(finalizeWhenIdle(&cont_), SA_OK);
        }
    }
    std::string get(const char *key)
    {
        char value[64];
        SaErrorT rc = kviCsCfgDataGet(key, sizeof value, value, &cont_);
        return rc == SA_OK ? value : "rc " + std::to_string(rc);
    }

    KviTempDir dir_;
    std::string path_;
    KviCsCfgContainer cont_{};
    bool loaded_ = false;
};

// Queries --------------------------------------------------------------------

using KviConfigQuery = ContainerTest;

TEST_F(KviConfigQuery, FirstOfDuplicateKeysWinsAndKeysAreExact)
{
    load("dup = \"first\"\ndup = \"second\"\nKey = \"upper\"\n");
    EXPECT_EQ(get("dup"), "first");
    EXPECT_EQ(get("Key"), "upper");
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM);
    char value[8];
    EXPECT_EQ(kviCsCfgDataGet("key", sizeof value, value, &cont_), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsCfgDataGet("Ke", sizeof value, value, &cont_), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("Not present"));
}

TEST_F(KviConfigQuery, ValueThatFillsTheBufferIsTruncatedWithoutTerminator)
{
    load("k = \"abcd\"\n");
    KviLogCapture log;
    char value[9];
    memset(value, 'X', sizeof value);
    EXPECT_EQ(kviCsCfgDataGet("k", 8, value, &cont_), SA_OK);
    EXPECT_EQ(std::string(value, 9), std::string("abcd\0\0\0\0X", 9)); // padded with NULs
    EXPECT_TRUE(log.contains("Size is 4+1 of 8"));

    memset(value, 'X', sizeof value);
    EXPECT_EQ(kviCsCfgDataGet("k", 5, value, &cont_), SA_OK);
    EXPECT_EQ(std::string(value, 6), std::string("abcd\0X", 6));

    memset(value, 'X', sizeof value);
    EXPECT_EQ(kviCsCfgDataGet("k", 4, value, &cont_), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(std::string(value, 5), "abcdX");
    EXPECT_TRUE(log.contains("Truncated"));
    EXPECT_EQ(kviCsCfgDataGet("k", 0, value, &cont_), SA_ERR_HPI_DATA_TRUNCATED);
    EXPECT_EQ(value[0], 'a');
}

TEST_F(KviConfigQuery, NullArgumentsAndTheDefaultContainerBeforeInit)
{
    load("k = \"1\"\n");
    KviLogCapture log;
    char value[8];
    SaHpiUint32T u = 0;
    SaHpiInt32T s = 0;
    EXPECT_EQ(kviCsCfgDataGet(nullptr, 8, value, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Key pointer is NULL."));
    EXPECT_EQ(kviCsCfgDataGet("k", 8, nullptr, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Value pointer is NULL."));
    EXPECT_EQ(kviCsCfgDataUint32Get(nullptr, &u, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCfgDataUint32Get("k", nullptr, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCfgDataInt32Get(nullptr, &s, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCfgDataInt32Get("k", nullptr, &cont_), SA_ERR_HPI_INVALID_PARAMS);

    // The default container was never initialized: refused, not a crash.
    log.clear();
    EXPECT_EQ(kviCsCfgDataGet("k", 8, value, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("cfgContainer->KeyValueList pointer is NULL."));
    EXPECT_EQ(kviCsCfgDataUint32Get("k", &u, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCfgDataInt32Get("k", &s, nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

TEST_F(KviConfigQuery, UnsignedNumbers)
{
    load("max = \"4294967295\"\nminus2 = \"-2\"\nblank = \"12 \"\nletters = \"12ab\"\n"
         "empty = \"\"\nhex = \"0x10\"\noctal = \"010\"\nlead = \"  7\"\n"
         "twelve = \"123456789012\"\nhuge = \"99999999999\"\nwrap = \"-4294967295\"\n"
         "hexmax = \"0xFFFFFFFF\"\nbelow = \"4294967294\"\nplus = \"+5\"\n");
    struct Case {
        const char *key;
        SaErrorT rc;
        SaHpiUint32T value;
        const char *message;
    };
    const Case cases[] = {
        {"max", SA_ERR_HPI_INVALID_DATA, 0xFFFFFFFFu, "Value out of range: 4294967295"},
        {"minus2", SA_OK, 4294967294u, nullptr},
        {"blank", SA_OK, 12, nullptr},
        {"letters", SA_ERR_HPI_INVALID_DATA, 12, "Value has invalid data: 12ab"},
        {"empty", SA_OK, 0, nullptr},
        {"hex", SA_OK, 16, nullptr},
        {"octal", SA_OK, 8, nullptr},
        {"lead", SA_OK, 7, nullptr},
        {"twelve", SA_ERR_HPI_DATA_TRUNCATED, 99, nullptr},
        // As where long has 32 bits: too large saturates, and is refused.
        {"huge", SA_ERR_HPI_INVALID_DATA, 0xFFFFFFFFu, "Value out of range: 99999999999"},
        {"wrap", SA_OK, 1, nullptr},
        {"hexmax", SA_ERR_HPI_INVALID_DATA, 0xFFFFFFFFu, "Value out of range: 0xFFFFFFFF"},
        {"below", SA_OK, 4294967294u, nullptr},
        {"plus", SA_OK, 5, nullptr},
        {"absent", SA_ERR_HPI_NOT_PRESENT, 99, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.key);
        KviLogCapture log;
        SaHpiUint32T value = 99;
        EXPECT_EQ(kviCsCfgDataUint32Get(c.key, &value, &cont_), c.rc);
        EXPECT_EQ(value, c.value);
        if (c.message != nullptr) {
            EXPECT_TRUE(log.contains(c.message));
        }
    }
}

TEST_F(KviConfigQuery, SignedNumbers)
{
    load("max = \"2147483647\"\nmin = \"-2147483648\"\nnear = \"2147483646\"\n"
         "neg = \"-5\"\nbig = \"3000000000\"\nhexmax = \"0x7fffffff\"\nfrac = \"1.5\"\n"
         "tab = \"-0x10\t\"\nnearmin = \"-2147483647\"\n");
    struct Case {
        const char *key;
        SaErrorT rc;
        SaHpiInt32T value;
        const char *message;
    };
    const Case cases[] = {
        {"max", SA_ERR_HPI_INVALID_DATA, INT32_MAX, "Value out of range: 2147483647"},
        {"min", SA_ERR_HPI_INVALID_DATA, INT32_MIN, "Value out of range: -2147483648"},
        {"near", SA_OK, 2147483646, nullptr},
        {"nearmin", SA_OK, -2147483647, nullptr},
        {"neg", SA_OK, -5, nullptr},
        {"big", SA_ERR_HPI_INVALID_DATA, INT32_MAX, "Value out of range: 3000000000"},
        {"hexmax", SA_ERR_HPI_INVALID_DATA, INT32_MAX, "Value out of range: 0x7fffffff"},
        {"frac", SA_ERR_HPI_INVALID_DATA, 1, "Value has invalid data: 1.5"},
        {"tab", SA_OK, -16, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.key);
        KviLogCapture log;
        SaHpiInt32T value = 99;
        EXPECT_EQ(kviCsCfgDataInt32Get(c.key, &value, &cont_), c.rc);
        EXPECT_EQ(value, c.value);
        if (c.message != nullptr) {
            EXPECT_TRUE(log.contains(c.message));
        }
    }
}

TEST(KviConfigListElement, ElementsOfASemicolonList)
{
    KviLogCapture log;
    char out[16];
    struct Case {
        const char *list;
        SaHpiUint32T element;
        SaErrorT rc;
        const char *value;
    };
    const Case cases[] = {
        {"a;b;", 0, SA_OK, "a"},
        {"a;b;", 1, SA_OK, "b"},
        {"a;b;", 2, SA_OK, ""},
        {"a;b;", 3, SA_ERR_HPI_NOT_PRESENT, nullptr},
        {"a;;b", 1, SA_OK, ""},
        {"a;;b", 2, SA_OK, "b"},
        {"", 0, SA_OK, ""},
        {"", 1, SA_ERR_HPI_NOT_PRESENT, nullptr},
        {" lib1.so ; lib2.so", 1, SA_OK, " lib2.so"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(std::string(c.list) + " #" + std::to_string(c.element));
        EXPECT_EQ(kviGetListElement(c.element, c.list, sizeof out, out), c.rc);
        if (c.value != nullptr) {
            EXPECT_STREQ(out, c.value);
        }
    }
    EXPECT_TRUE(log.contains("Result String is b"));
}

TEST(KviConfigListElement, ResultBufferLimits)
{
    KviLogCapture log;
    char out[8];
    EXPECT_EQ(kviGetListElement(0, "abc;d", 4, out), SA_OK);
    EXPECT_STREQ(out, "abc");
    EXPECT_EQ(kviGetListElement(0, "abcd;e", 4, out), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Parameter ResultMaxSize=4 is too small"));
    EXPECT_EQ(kviGetListElement(0, "a", 2, out), SA_OK);
    EXPECT_EQ(kviGetListElement(0, "a", 1, out), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("ResultMaxSize is 1.  How can anyone put a module name in that!?"));
    EXPECT_EQ(kviGetListElement(0, nullptr, 8, out), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("StringToParse pointer is NULL."));
    EXPECT_EQ(kviGetListElement(0, "a", 8, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Result pointer is NULL."));
}

// Containers -----------------------------------------------------------------

TEST(KviConfigContainer, InitializationRefusesBadArgumentsAndMissingFiles)
{
    KviLogCapture log;
    KviTempDir dir;
    KviCsCfgContainer cont;
    SaHpiInt32T base = kviTestLiveBlocks();
    EXPECT_EQ(kviCsConfigInitStructure(nullptr, SAHPI_FALSE, "x"), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("ConfigContainer pointer is NULL."));
    EXPECT_EQ(kviCsConfigInitStructure(&cont, SAHPI_FALSE, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("FileName pointer is NULL."));

    std::string missing = dir.file("missing.conf");
    EXPECT_EQ(kviCsConfigInitStructure(&cont, SAHPI_TRUE, missing.c_str()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsConfigLoadValues failed for file " + missing));
    EXPECT_EQ(cont.KeyValueList, nullptr);
    EXPECT_EQ(cont.Filename, nullptr);
    EXPECT_EQ(cont.CallbackList, nullptr);
    EXPECT_FALSE(cont.HasThread);
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(KviConfigContainer, EveryAllocationFailureIsUndoneWithoutLeaks)
{
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", "a = \"1\"\nb = \"2\"\n");
    SaHpiInt32T base = kviTestLiveBlocks();
    // File name, callback list, list header, read buffer, four blocks a
    // pair, the watcher's thread number.
    const SaHpiInt32T allocations = 3 + 1 + 2 * 4 + 1;
    for (SaHpiInt32T nth = 1; nth <= allocations + 1; ++nth) {
        SCOPED_TRACE(nth);
        KviCsCfgContainer cont;
        kviCsMemoryFailNthAllocation(nth);
        SaErrorT rc = kviCsConfigInitStructure(&cont, SAHPI_TRUE, path.c_str());
        kviCsMemoryFailNthAllocation(0);
        bool pairBlock = nth > 4 && nth < allocations;
        if (pairBlock || nth > allocations) {
            // A pair that could not be stored is lost; the rest loads.
            ASSERT_EQ(rc, SA_OK);
            EXPECT_TRUE(cont.HasThread);
            EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_OK);
        } else {
            EXPECT_NE(rc, SA_OK);
            EXPECT_EQ(cont.KeyValueList, nullptr);
        }
        EXPECT_EQ(kviTestLiveBlocks(), base);
    }
    EXPECT_TRUE(log.contains("Malloc failed"));
    EXPECT_TRUE(log.contains("Unable to load config file " + path));
    EXPECT_TRUE(log.contains("Unable to malloc space!"));
}

TEST(KviConfigContainer, FinalizationRefusesAContainerInUse)
{
    KviLogCapture log;
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", "a = \"1\"\n");
    SaHpiInt32T base = kviTestLiveBlocks();
    KviCsCfgContainer cont;
    ASSERT_EQ(kviCsConfigInitStructure(&cont, SAHPI_FALSE, path.c_str()), SA_OK);

    ASSERT_EQ(KVI_CS_SEM_WAIT(&cont.DeleteSem, 0), SA_OK);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("DeleteSem is locked.  No other thread should be using it"));
    ASSERT_EQ(KVI_CS_SEM_POST(&cont.DeleteSem), SA_OK);

    ASSERT_EQ(KVI_CS_SEM_WAIT(&cont.GeneralSem, 0), SA_OK);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("GeneralSem is locked.  No other thread should be using it"));
    ASSERT_EQ(KVI_CS_SEM_POST(&cont.GeneralSem), SA_OK);

    // Both refusals left the container whole and usable.
    char value[4];
    EXPECT_EQ(kviCsCfgDataGet("a", sizeof value, value, &cont), SA_OK);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), base);

    // Finalizing zeroes the container, so a second finalization is refused.
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("CfgContainer->Filename pointer is NULL."));
    EXPECT_EQ(kviCsConfigFinalizeStrucure(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("CfgContainer pointer is NULL."));
}

void ignoredCallback() {}

TEST(KviConfigContainer, FinalizationWithCallbacksLeftComplainsAndFreesAll)
{
    KviLogCapture log;
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", "a = \"1\"\n");
    SaHpiInt32T base = kviTestLiveBlocks();
    KviCsCfgContainer cont;
    ASSERT_EQ(kviCsConfigInitStructure(&cont, SAHPI_FALSE, path.c_str()), SA_OK);
    ASSERT_EQ(kviCsConfigRegister(ignoredCallback, &cont), SA_OK);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_OK);
    EXPECT_TRUE(log.contains(
        "Callback count isn't zero! Callbacks should have all been unregistered! Count = 1"));
    EXPECT_TRUE(log.contains("CallbackList freed"));
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(KviConfigContainer, DefaultContainerLifecycle)
{
    KviLogCapture log;
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", "max_mapl_count = \"8\"\n");
    SaHpiInt32T base = kviTestLiveBlocks();

    EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, dir.file("missing").c_str()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsConfigInitStructure failed -1001"));
    SaHpiUint32T count = 0;
    EXPECT_EQ(kviCsCfgDataUint32Get("max_mapl_count", &count, nullptr), SA_ERR_HPI_INVALID_PARAMS);

    ASSERT_EQ(kviCsConfigInit(SAHPI_TRUE, path.c_str()), SA_OK);
    EXPECT_EQ(kviCsCfgDataUint32Get("max_mapl_count", &count, nullptr), SA_OK);
    EXPECT_EQ(count, 8u);
    // A second initialization would lose the live container.
    EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, path.c_str()), SA_ERR_HPI_DUPLICATE);
    EXPECT_EQ(kviCsConfigAddWaitingThread(nullptr), SA_ERR_HPI_DUPLICATE);

    EXPECT_EQ(kviCsConfigFinalize(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), base);
    EXPECT_EQ(kviCsCfgDataUint32Get("max_mapl_count", &count, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    // Finalizing what is not there is only logged.
    EXPECT_EQ(kviCsConfigFinalize(), SA_OK);
    EXPECT_TRUE(log.contains("kviCsConfigFinalizeStrucure for default container failed -1011"));
    EXPECT_EQ(kviCsConfigRegister(ignoredCallback, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsConfigUnregister(ignoredCallback, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsConfigAddWaitingThread(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsConfigProcessChanges(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("CfgContainer pointer is NULL."));

    // And it can be initialized again.
    ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, path.c_str()), SA_OK);
    EXPECT_EQ(kviCsConfigFinalize(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

// Callbacks ------------------------------------------------------------------

std::vector<int> calls;
template <int N> void record()
{
    calls.push_back(N);
}
template <int... N>
std::array<KviCsCfgCallback, sizeof...(N)> recorders(std::integer_sequence<int, N...>)
{
    return {record<N>...};
}
const auto callback = recorders(std::make_integer_sequence<int, 12>{});

using KviConfigCallbacks = ContainerTest;

TEST_F(KviConfigCallbacks, RegistrationRefusesDuplicatesAndGrowsAtTheEleventh)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    EXPECT_EQ(kviCsConfigRegister(nullptr, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("FnPtr pointer is NULL."));
    ASSERT_EQ(kviCsConfigRegister(callback[0], &cont_), SA_OK);
    EXPECT_EQ(kviCsConfigRegister(callback[0], &cont_), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(log.contains("Callback already registered"));
    for (int i = 1; i < 10; ++i)
        ASSERT_EQ(kviCsConfigRegister(callback[i], &cont_), SA_OK);
    EXPECT_EQ(cont_.CallbackList->CountAllocated, 10u);

    // Growing can fail, and then nothing changes.
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigRegister(callback[10], &cont_), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Realloc failed"));
    EXPECT_EQ(cont_.CallbackCount, 10u);

    ASSERT_EQ(kviCsConfigRegister(callback[10], &cont_), SA_OK);
    EXPECT_EQ(cont_.CallbackList->CountAllocated, 21u);
    EXPECT_EQ(cont_.CallbackCount, 11u);

    calls.clear();
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_OK);
    EXPECT_EQ(calls, (std::vector<int>{0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10}));
    for (int i = 0; i < 11; ++i)
        EXPECT_EQ(kviCsConfigUnregister(callback[i], &cont_), SA_OK);
}

TEST_F(KviConfigCallbacks, UnregisteringMovesTheLastIntoTheGap)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    EXPECT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("Attempt to unregister FnPtr when 0 registered"));
    for (int i = 0; i < 3; ++i)
        ASSERT_EQ(kviCsConfigRegister(callback[i], &cont_), SA_OK);
    ASSERT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_OK);
    calls.clear();
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_OK);
    EXPECT_EQ(calls, (std::vector<int>{2, 1}));

    EXPECT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("FnPtr not present in the list"));
    EXPECT_EQ(kviCsConfigUnregister(nullptr, &cont_), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsConfigUnregister(callback[1], &cont_), SA_OK);
    EXPECT_EQ(kviCsConfigUnregister(callback[2], &cont_), SA_OK);
    EXPECT_EQ(cont_.CallbackCount, 0u);
}

TEST_F(KviConfigCallbacks, RunningCallbacksCanRunOutOfMemory)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_OK); // nothing to copy, nothing to fail
    ASSERT_EQ(kviCsConfigRegister(callback[0], &cont_), SA_OK);
    calls.clear();
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Malloc failed"));
    EXPECT_TRUE(calls.empty());
    EXPECT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_OK);
}

KviCsCfgContainer *reading = nullptr;
std::string seenInCallback;
void readingCallback()
{
    char value[16] = "";
    kviCsCfgDataGet("a", sizeof value, value, reading);
    seenInCallback = value;
    // Registered now, called from the next change on.
    kviCsConfigRegister(callback[5], reading);
}

TEST_F(KviConfigCallbacks, ReloadSwapsTheListAndCallbacksMayReadAndRegister)
{
    load("a = \"old\"\n");
    reading = &cont_;
    SaHpiInt64T firstLoad = cont_.UpdateTime;
    ASSERT_EQ(kviCsConfigRegister(readingCallback, &cont_), SA_OK);
    dir_.write("kvi.conf", "a = \"new\"\nb = \"2\"\n");
    shiftModificationTime(path_, -100);

    SaHpiInt32T blocks = kviTestLiveBlocks();
    calls.clear();
    ASSERT_EQ(kviCsConfigProcessChanges(&cont_), SA_OK);
    EXPECT_EQ(seenInCallback, "new");
    EXPECT_EQ(get("b"), "2");
    EXPECT_TRUE(calls.empty());
    EXPECT_EQ(cont_.CallbackCount, 2u);
    // Only the list is replaced: the time of the first load stays.
    EXPECT_EQ(cont_.UpdateTime, firstLoad);
    EXPECT_EQ(kviTestLiveBlocks(), blocks + 4); // one pair more, nothing leaked

    ASSERT_EQ(kviCsConfigProcessChanges(&cont_), SA_OK);
    EXPECT_EQ(calls, (std::vector<int>{5}));
    EXPECT_EQ(kviCsConfigRegister(callback[5], &cont_), SA_ERR_HPI_DUPLICATE);
    EXPECT_EQ(kviCsConfigUnregister(readingCallback, &cont_), SA_OK);
    EXPECT_EQ(kviCsConfigUnregister(callback[5], &cont_), SA_OK);
}

TEST_F(KviConfigCallbacks, AReloadThatFailsKeepsTheOldSettings)
{
    load("a = \"old\"\n");
    KviLogCapture log;
    SaHpiInt32T blocks = kviTestLiveBlocks();
    dir_.write("kvi.conf", "a = \"new\"\n");
    for (SaHpiInt32T nth = 1; nth <= 4; ++nth) { // the new container's own blocks
        kviCsMemoryFailNthAllocation(nth);
        EXPECT_EQ(kviCsConfigProcessChanges(&cont_), SA_ERR_HPI_ERROR);
        EXPECT_EQ(kviTestLiveBlocks(), blocks);
    }
    EXPECT_TRUE(log.contains("kviCsConfigInitStructure returned"));
    ASSERT_EQ(remove(path_.c_str()), 0);
    EXPECT_EQ(kviCsConfigProcessChanges(&cont_), SA_ERR_HPI_ERROR);
    EXPECT_EQ(get("a"), "old");
    EXPECT_EQ(kviTestLiveBlocks(), blocks);
}

// The watcher ----------------------------------------------------------------

std::atomic<int> watcherCalls{0};
void countingCallback()
{
    watcherCalls++;
}

TEST_F(KviConfigCallbacks, WatcherReloadsATouchedFileAndKeepsReloadingEverySecond)
{
    load("a = \"1\"\n", SAHPI_TRUE);
    ASSERT_TRUE(cont_.HasThread);
    ASSERT_EQ(kviCsConfigRegister(countingCallback, &cont_), SA_OK);
    watcherCalls = 0;
    std::this_thread::sleep_for(1200ms); // at least one poll of an unchanged file
    EXPECT_EQ(watcherCalls.load(), 0);

    dir_.write("kvi.conf", "a = \"2\"\n");
    shiftModificationTime(path_, -100);
    ASSERT_TRUE(waitFor([] { return watcherCalls.load() >= 1; }, 3000ms));
    EXPECT_EQ(get("a"), "2");
    // The container keeps its first load's time, so every poll differs now.
    auto start = Clock::now();
    ASSERT_TRUE(waitFor([] { return watcherCalls.load() >= 3; }, 4000ms));
    EXPECT_GT(msSince(start), 900);
    EXPECT_EQ(kviCsConfigUnregister(countingCallback, &cont_), SA_OK);
}

TEST_F(KviConfigCallbacks, FinalizationStopsTheWatcherPromptly)
{
    load("a = \"1\"\n", SAHPI_TRUE);
    std::this_thread::sleep_for(250ms);
    auto start = Clock::now();
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont_), SA_OK);
    EXPECT_LT(msSince(start), 400);
    EXPECT_FALSE(cont_.HasThread);
    loaded_ = false;
}

TEST_F(KviConfigCallbacks, AWatcherCanBeAddedOnceAndEndsWhenItsFileGoes)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    ASSERT_EQ(kviCsConfigAddWaitingThread(&cont_), SA_OK);
    EXPECT_EQ(kviCsConfigAddWaitingThread(&cont_), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(log.contains("kviCsConfigAddWaitingThread called on config container with thread"));
    ASSERT_EQ(remove(path_.c_str()), 0);
    EXPECT_TRUE(
        waitFor([&] { return log.contains("Unable to load config file " + path_); }, 3000ms));
    // The thread has ended; finalization joins it all the same.
}

TEST_F(KviConfigCallbacks, AddingAWatcherCanFail)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    SaHpiInt32T blocks = kviTestLiveBlocks();
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigAddWaitingThread(&cont_), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Unable to malloc space"));
    EXPECT_FALSE(cont_.HasThread);
    EXPECT_EQ(kviTestLiveBlocks(), blocks);

    EXPECT_EQ(kviCsThreadRoutine(nullptr), nullptr);
    EXPECT_TRUE(log.contains("CfgContainer is NULL"));
}

void wedgeDeleteSem()
{
    reading->DeleteSem.Value = KVI_MAX_INT32;
}

TEST_F(KviConfigCallbacks, AFailedReleaseEndsTheProcess)
{
    load("a = \"1\"\n");
    reading = &cont_;
    ASSERT_EQ(kviCsConfigRegister(wedgeDeleteSem, &cont_), SA_OK);
    KviLogCapture log;
    EXPECT_EXIT(kviCsConfigPerformCallbacks(&cont_), testing::ExitedWithCode(1), "");
    EXPECT_TRUE(log.contains("kviCsSemPost on &(cfgContainer->DeleteSem) returned -1001"));
    EXPECT_EQ(kviCsConfigUnregister(wedgeDeleteSem, &cont_), SA_OK);
}
} // namespace
