// Queries, containers, change callbacks and the watcher thread of the
// configuration unit.
#include <gtest/gtest.h>

#include <array>
#include <atomic>
#include <chrono>
#include <cstring>
#include <ctime>
#include <functional>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include <sys/time.h>

#include "core/utils/KviConfig.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
using Clock = std::chrono::steady_clock;
using namespace std::chrono_literals;

// Moves a file's modification time back by whole seconds: a change the
// watcher sees at once, without waiting for the clock's next second.
void backdate(const std::string &path)
{
    struct timeval times[2] = {{time(nullptr) - 100, 0}, {time(nullptr) - 100, 0}};
    ASSERT_EQ(utimes(path.c_str(), times), 0);
}

bool waitFor(const std::function<bool()> &done, std::chrono::milliseconds limit)
{
    for (auto deadline = Clock::now() + limit; !done(); std::this_thread::sleep_for(10ms))
        if (Clock::now() > deadline)
            return false;
    return true;
}

// A container loaded from a file of its own. Finalization refuses a container
// whose callbacks run at that moment (a watcher reloads every second), so
// tearing down tries again.
class ContainerTest : public testing::Test
{
  protected:
    void load(const std::string &text, SaHpiBoolT watch = SAHPI_FALSE)
    {
        path_ = dir_.write("kvi.conf", text);
        ASSERT_EQ(kviCsConfigInitStructure(&cont_, watch, path_.c_str()), SA_OK);
    }
    void TearDown() override
    {
        for (int i = 0; cont_.Filename != nullptr && i < 50; ++i)
            if (kviCsConfigFinalizeStrucure(&cont_) != SA_OK)
                std::this_thread::sleep_for(5ms);
        EXPECT_EQ(cont_.Filename, nullptr); // finalized, which zeroes it
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
};

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

// Queries --------------------------------------------------------------------

using KviConfigQuery = ContainerTest;

TEST_F(KviConfigQuery, FirstExactKeyWinsAndTheValueIsCutToTheBuffer)
{
    load("dup = \"first\"\ndup = \"second\"\nKey = \"upper\"\nk = \"abcd\"\n");
    EXPECT_EQ(get("dup"), "first");
    EXPECT_EQ(get("Key"), "upper");
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM);
    EXPECT_EQ(get("key"), "rc -1013");
    EXPECT_EQ(get("Ke"), "rc -1013");
    // Size, result and the buffer afterwards (one guard byte 'X' more):
    // padded with NULs, or cut without a terminator.
    const std::tuple<SaHpiUint32T, SaErrorT, std::string> cases[] = {
        {8, SA_OK, std::string("abcd\0\0\0\0X", 9)},
        {5, SA_OK, std::string("abcd\0X", 6)},
        {4, SA_ERR_HPI_DATA_TRUNCATED, "abcdX"},
        {0, SA_ERR_HPI_DATA_TRUNCATED, "X"},
    };
    for (const auto &[size, rc, after] : cases) {
        SCOPED_TRACE(size);
        char value[9];
        memset(value, 'X', sizeof value);
        EXPECT_EQ(kviCsCfgDataGet("k", size, value, &cont_), rc);
        EXPECT_EQ(std::string(value, after.size()), after);
    }
    EXPECT_TRUE(log.contains("Size is 4+1 of 8"));
    EXPECT_TRUE(log.contains("Truncated"));
    EXPECT_TRUE(log.contains("Not present"));
}

TEST_F(KviConfigQuery, NumbersAreRefusedWhenSaturatedOrFollowedByGarbage)
{
    const char *range = "out of range";
    const char *garbage = "has invalid data";
    // Signed?, text, result, value (99: left alone), the warning's wording.
    const std::tuple<bool, const char *, SaErrorT, long long, const char *> cases[] = {
        {false, "4294967295", SA_ERR_HPI_INVALID_DATA, 0xFFFFFFFFu, range},
        {false, "4294967294", SA_OK, 4294967294u, nullptr},
        {false, "-2", SA_OK, 4294967294u, nullptr},
        {false, "12 ", SA_OK, 12, nullptr},
        {false, "12ab", SA_ERR_HPI_INVALID_DATA, 12, garbage},
        {false, "", SA_OK, 0, nullptr},
        {false, "0x10", SA_OK, 16, nullptr},
        {false, "010", SA_OK, 8, nullptr},
        {false, "123456789012", SA_ERR_HPI_DATA_TRUNCATED, 99, nullptr},
        // As where long has 32 bits: too large saturates, and is refused.
        {false, "99999999999", SA_ERR_HPI_INVALID_DATA, 0xFFFFFFFFu, range},
        {false, "-4294967295", SA_OK, 1, nullptr},
        {true, "2147483647", SA_ERR_HPI_INVALID_DATA, INT32_MAX, range},
        {true, "-2147483648", SA_ERR_HPI_INVALID_DATA, INT32_MIN, range},
        {true, "2147483646", SA_OK, 2147483646, nullptr},
        {true, "-2147483647", SA_OK, -2147483647, nullptr},
        {true, "3000000000", SA_ERR_HPI_INVALID_DATA, INT32_MAX, range},
        {true, "0x7fffffff", SA_ERR_HPI_INVALID_DATA, INT32_MAX, range},
        {true, "1.5", SA_ERR_HPI_INVALID_DATA, 1, garbage},
        {true, "-0x10\t", SA_OK, -16, nullptr},
    };
    std::string file;
    for (size_t i = 0; i < std::size(cases); ++i)
        file += "k" + std::to_string(i) + " = \"" + std::get<1>(cases[i]) + "\"\n";
    load(file);
    for (size_t i = 0; i < std::size(cases); ++i) {
        const auto &[isSigned, text, rc, value, problem] = cases[i];
        SCOPED_TRACE(std::string(isSigned ? "signed " : "unsigned ") + text);
        const std::string key = "k" + std::to_string(i);
        KviLogCapture log;
        SaHpiUint32T u = 99;
        SaHpiInt32T s = 99;
        EXPECT_EQ(isSigned ? kviCsCfgDataInt32Get(key.c_str(), &s, &cont_)
                           : kviCsCfgDataUint32Get(key.c_str(), &u, &cont_),
                  rc);
        EXPECT_EQ(isSigned ? static_cast<long long>(s) : static_cast<long long>(u), value);
        if (problem == nullptr)
            continue;
        // The warning names the query that was called.
        auto lines = log.matching(std::string("Value ") + problem + ": " + text);
        ASSERT_EQ(lines.size(), 1u);
        EXPECT_NE(lines[0].find(isSigned ? " kviCsCfgDataInt32Get()" : " kviCsCfgDataUint32Get()"),
                  std::string::npos);
    }
    SaHpiUint32T u = 99;
    EXPECT_EQ(kviCsCfgDataUint32Get("absent", &u, &cont_), SA_ERR_HPI_NOT_PRESENT);
}

TEST(KviConfigListElement, ElementsOfASemicolonListAndBufferLimits)
{
    KviLogCapture log;
    struct Case {
        const char *list;
        SaHpiUint32T element, size;
        SaErrorT rc;
        const char *value;
    };
    const Case cases[] = {
        {"a;b;", 0, 16, SA_OK, "a"},
        {"a;b;", 1, 16, SA_OK, "b"},
        {"a;b;", 2, 16, SA_OK, ""},
        {"a;b;", 3, 16, SA_ERR_HPI_NOT_PRESENT, nullptr},
        {"a;;b", 1, 16, SA_OK, ""},
        {"a;;b", 2, 16, SA_OK, "b"},
        {"", 0, 16, SA_OK, ""},
        {"", 1, 16, SA_ERR_HPI_NOT_PRESENT, nullptr},
        {" lib1.so ; lib2.so", 1, 16, SA_OK, " lib2.so"},
        {"abc;d", 0, 4, SA_OK, "abc"},
        {"abcd;e", 0, 4, SA_ERR_HPI_OUT_OF_SPACE, nullptr},
        {"a", 0, 2, SA_OK, "a"},
        {"a", 0, 1, SA_ERR_HPI_INVALID_PARAMS, nullptr},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(std::string(c.list) + " #" + std::to_string(c.element));
        char out[16];
        EXPECT_EQ(kviGetListElement(c.element, c.list, c.size, out), c.rc);
        if (c.value != nullptr) {
            EXPECT_STREQ(out, c.value);
        }
    }
    EXPECT_TRUE(log.contains("Result String is b"));
    EXPECT_TRUE(log.contains("Parameter ResultMaxSize=4 is too small"));
    EXPECT_TRUE(log.contains("ResultMaxSize is 1.  How can anyone put a module name in that!?"));
}

void ignoredCallback() {}

#define CALL(function, ...) [&] { return function(__VA_ARGS__); }

TEST(KviConfigArguments, NullPointersAndAnUninitializedDefaultContainerAreRefused)
{
    KviLogCapture log;
    KviCsCfgContainer cont{};
    char buf[8];
    const char *uninitialized = "cfgContainer->KeyValueList pointer is NULL.";
    const std::pair<std::function<SaErrorT()>, const char *> cases[] = {
        {CALL(kviCsCfgDataGet, nullptr, 8, buf, &cont), "Key pointer is NULL."},
        {CALL(kviCsCfgDataInt32Get, "k", nullptr, &cont), "Value pointer is NULL."},
        {CALL(kviGetListElement, 0, nullptr, 8, buf), "StringToParse pointer is NULL."},
        {CALL(kviCsConfigInitStructure, nullptr, 0, "x"), "ConfigContainer pointer is NULL."},
        {CALL(kviCsConfigFinalizeStrucure, &cont), "CfgContainer->Filename pointer is NULL."},
        {CALL(kviCsConfigRegister, nullptr, &cont), "FnPtr pointer is NULL."},
        {CALL(kviCsConfigLoadValues, &cont), "ConfigContainer->Filename pointer is NULL."},
        {CALL(kviCsCfgDataParseData, "a", 1, nullptr), "CfgCont pointer is NULL."},
        {CALL(kviCsCfgDataParseKeyValuePair, "a", 1, 1, nullptr, &cont), "Index pointer is NULL."},
        // The default container was never initialized: refused, not a crash.
        {CALL(kviCsCfgDataGet, "k", 8, buf, nullptr), uninitialized},
        {CALL(kviCsConfigRegister, ignoredCallback, nullptr), uninitialized},
        {CALL(kviCsConfigAddWaitingThread, nullptr), uninitialized},
    };
    for (const auto &[call, message] : cases) {
        SCOPED_TRACE(message);
        log.clear();
        EXPECT_EQ(call(), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_TRUE(log.contains(message));
    }
    EXPECT_EQ(kviCsThreadRoutine(nullptr), nullptr);
    EXPECT_TRUE(log.contains("CfgContainer is NULL"));
}

// Containers -----------------------------------------------------------------

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
        if ((nth > 4 && nth < allocations) || nth > allocations) {
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

    // A missing file is undone the same way, watcher and all.
    KviCsCfgContainer cont;
    std::string missing = dir.file("missing.conf");
    EXPECT_EQ(kviCsConfigInitStructure(&cont, SAHPI_TRUE, missing.c_str()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsConfigLoadValues failed for file " + missing));
    EXPECT_TRUE(cont.KeyValueList == nullptr && cont.Filename == nullptr &&
                cont.CallbackList == nullptr && !cont.HasThread);
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(KviConfigContainer, FinalizationRefusesAContainerInUseAndFreesCallbacksLeft)
{
    KviLogCapture log;
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", "a = \"1\"\n");
    SaHpiInt32T base = kviTestLiveBlocks();
    KviCsCfgContainer cont;
    ASSERT_EQ(kviCsConfigInitStructure(&cont, SAHPI_FALSE, path.c_str()), SA_OK);
    for (KviCsSemaphore *sem : {&cont.DeleteSem, &cont.GeneralSem}) {
        ASSERT_EQ(KVI_CS_SEM_WAIT(sem, 0), SA_OK);
        EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_ERR_HPI_INVALID_REQUEST);
        ASSERT_EQ(KVI_CS_SEM_POST(sem), SA_OK);
    }
    EXPECT_TRUE(log.contains("DeleteSem is locked.  No other thread should be using it"));
    EXPECT_TRUE(log.contains("GeneralSem is locked.  No other thread should be using it"));

    // Both refusals left the container whole and usable.
    char value[4];
    EXPECT_EQ(kviCsCfgDataGet("a", sizeof value, value, &cont), SA_OK);
    ASSERT_EQ(kviCsConfigRegister(ignoredCallback, &cont), SA_OK);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_OK);
    EXPECT_TRUE(log.contains(
        "Callback count isn't zero! Callbacks should have all been unregistered! Count = 1"));
    EXPECT_TRUE(log.contains("CallbackList freed"));
    EXPECT_EQ(kviTestLiveBlocks(), base);
    // Finalizing zeroes the container, so a second finalization is refused.
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_ERR_HPI_INVALID_PARAMS);
}

TEST(KviConfigContainer, DefaultContainerLifecycle)
{
    KviLogCapture log;
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", "max_mapl_count = \"8\"\n");
    SaHpiInt32T base = kviTestLiveBlocks();
    SaHpiUint32T count = 0;

    EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, dir.file("missing").c_str()), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("kviCsConfigInitStructure failed -1001"));
    EXPECT_EQ(kviCsCfgDataUint32Get("max_mapl_count", &count, nullptr), SA_ERR_HPI_INVALID_PARAMS);

    for (int round = 0; round < 2; ++round) { // it can be initialized again
        ASSERT_EQ(kviCsConfigInit(round == 0 ? SAHPI_TRUE : SAHPI_FALSE, path.c_str()), SA_OK);
        EXPECT_EQ(kviCsCfgDataUint32Get("max_mapl_count", &count, nullptr), SA_OK);
        EXPECT_EQ(count, 8u);
        // A second initialization would lose the live container.
        EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, path.c_str()), SA_ERR_HPI_DUPLICATE);
        EXPECT_EQ(kviCsConfigAddWaitingThread(nullptr), round == 0 ? SA_ERR_HPI_DUPLICATE : SA_OK);
        EXPECT_EQ(kviCsConfigFinalize(), SA_OK);
        EXPECT_EQ(kviTestLiveBlocks(), base);
        EXPECT_EQ(kviCsCfgDataUint32Get("max_mapl_count", &count, nullptr),
                  SA_ERR_HPI_INVALID_PARAMS);
    }
    // Finalizing what is not there is only logged.
    EXPECT_EQ(kviCsConfigFinalize(), SA_OK);
    EXPECT_TRUE(log.contains("kviCsConfigFinalizeStrucure for default container failed -1011"));
}

// Callbacks ------------------------------------------------------------------

using KviConfigCallbacks = ContainerTest;

TEST_F(KviConfigCallbacks, RegistrationGrowsAtTheEleventhAndUnregisteringFillsTheGap)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    EXPECT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("Attempt to unregister FnPtr when 0 registered"));
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_OK); // nothing to copy, nothing to fail
    for (int i = 0; i < 10; ++i)
        ASSERT_EQ(kviCsConfigRegister(callback[i], &cont_), SA_OK);
    EXPECT_EQ(kviCsConfigRegister(callback[0], &cont_), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(log.contains("Callback already registered"));
    EXPECT_EQ(cont_.CallbackList->CountAllocated, 10u);

    // Growing can fail, and then nothing changes.
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigRegister(callback[10], &cont_), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Realloc failed"));
    EXPECT_EQ(cont_.CallbackCount, 10u);
    ASSERT_EQ(kviCsConfigRegister(callback[10], &cont_), SA_OK);
    EXPECT_EQ(cont_.CallbackList->CountAllocated, 21u);

    // So can copying the list to run it; then no callback runs.
    calls.clear();
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Malloc failed"));
    EXPECT_TRUE(calls.empty());

    // The last entry moves into the gap: order is not kept.
    ASSERT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_OK);
    EXPECT_EQ(kviCsConfigUnregister(callback[0], &cont_), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("FnPtr not present in the list"));
    EXPECT_EQ(kviCsConfigPerformCallbacks(&cont_), SA_OK);
    EXPECT_EQ(calls, (std::vector<int>{10, 1, 2, 3, 4, 5, 6, 7, 8, 9}));
    for (int i = 1; i < 11; ++i)
        EXPECT_EQ(kviCsConfigUnregister(callback[i], &cont_), SA_OK);
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
    backdate(path_);

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
    backdate(path_);
    ASSERT_TRUE(waitFor([] { return watcherCalls.load() >= 1; }, 3000ms));
    EXPECT_EQ(get("a"), "2");
    // The container keeps its first load's time, so every poll differs now.
    auto start = Clock::now();
    ASSERT_TRUE(waitFor([] { return watcherCalls.load() >= 3; }, 4000ms));
    EXPECT_GT(Clock::now() - start, 900ms);
    EXPECT_EQ(kviCsConfigUnregister(countingCallback, &cont_), SA_OK);
}

TEST_F(KviConfigCallbacks, AWatcherIsAddedOnceAndFinalizationStopsItPromptly)
{
    load("a = \"1\"\n");
    KviLogCapture log;
    SaHpiInt32T blocks = kviTestLiveBlocks();
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsConfigAddWaitingThread(&cont_), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("Unable to malloc space"));
    EXPECT_FALSE(cont_.HasThread);
    EXPECT_EQ(kviTestLiveBlocks(), blocks);

    ASSERT_EQ(kviCsConfigAddWaitingThread(&cont_), SA_OK);
    EXPECT_EQ(kviCsConfigAddWaitingThread(&cont_), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(log.contains("kviCsConfigAddWaitingThread called on config container with thread"));
    std::this_thread::sleep_for(250ms);
    auto start = Clock::now();
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont_), SA_OK);
    EXPECT_LT(Clock::now() - start, 400ms);
}

TEST_F(KviConfigCallbacks, AWatcherEndsWhenItsFileGoes)
{
    load("a = \"1\"\n", SAHPI_TRUE);
    KviLogCapture log;
    ASSERT_EQ(remove(path_.c_str()), 0);
    EXPECT_TRUE(
        waitFor([&] { return log.contains("Unable to load config file " + path_); }, 3000ms));
    // The thread has ended; finalization joins it all the same.
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
