// The plug-in manager with real plug-ins loaded through the real loader. The
// manager is initialized once per process; the death tests, which googletest
// runs first, fork from the untouched process and so start from nothing.
#include "daemon/maplManager/MaplManager.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "KviTestMapls.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{

constexpr const char *LIMITS = "max_mapl_count = \"3\"\nmax_mapl_rwlocks_count = \"2\"\n";

std::string pathOf(std::string_view Name)
{
    return kviTestMaplPath(Name);
}

// ---- From a fresh process ----

// Runs in the child: the configuration, then the manager, then the checks
// of Check; the exit status tells which step failed.
template <typename Check> int freshManager(const std::string &Config, Check check)
{
    if (kviCsConfigInit(SAHPI_FALSE, Config.c_str()) != SA_OK)
        return 10;
    if (kviDsMaplManagerInitialize() != SA_OK)
        return 11;
    return check();
}

TEST(MaplManagerDeathTest, EveryOperationIsRefusedBeforeInitialize)
{
    KviLogCapture log(KVI_LOG_WARN_NUM);
    auto child = [] {
        KviCsRwLockT *lock = nullptr;
        const SaErrorT results[] = {
            kviDsMaplManagerLoadMapls(),
            kviDsMaplManagerUnloadAllMapls(),
            kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID),
            kviDsMaplManagerGetMaplLock(0, 0, &lock),
            kviDsMaplManagerUnprotectedGetMaplLock(0, 0, &lock),
            kviDsMaplManagerGetMaplMasterLock(&lock),
            kviDsMaplManagerUnloadMapl(0),
        };
        for (SaErrorT rc : results)
            if (rc != SA_ERR_HPI_UNINITIALIZED)
                return 1;
        return kviDsMaplManagerFinalize() == SA_ERR_HPI_INVALID_REQUEST ? 0 : 2;
    };
    EXPECT_EXIT(exit(child()), testing::ExitedWithCode(0), "");
    EXPECT_EQ(log.matching("MaplManager has not been initialized").size(), 7u);
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_NONFATAL_NUM,
                                "kviDsMaplManagerFinalize called when not initalized"));
}

TEST(MaplManagerDeathTest, LimitsComeFromTheConfigurationWithTenAsTheFallback)
{
    struct Case {
        const char *lines;
        SaHpiUint32T slots;
        SaHpiUint32T locks;
        std::vector<std::string> messages;
    };
    const Case cases[] = {
        {"", 10, 10, {}},
        {"max_mapl_count = \"3\"\nmax_mapl_rwlocks_count = \"2\"\n", 3, 2, {}},
        {"max_mapl_count = \"0\"\nmax_mapl_rwlocks_count = \"0\"\n",
         10,
         10,
         {"Invalid value 0 for max_mapl_count in config file.",
          "Invalid value 0 for max_mapl_rwlocks_count in config file."}},
        {"max_mapl_count = \"many\"\nmax_mapl_rwlocks_count = \"0x4\"\n",
         10,
         10,
         {"Invalid value many for max_mapl_count in config file.",
          "Invalid value 0x4 for max_mapl_rwlocks_count in config file."}},
        // Read as a number as far as it goes.
        {"max_mapl_count = \"12abc\"\n", 12, 10, {}},
        {"max_mapl_count = \"123456789012345678901234567890\"\n",
         10,
         10,
         {"Unexpected return code of -1008 when recovering max_mapl_count"}},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.lines);
        KviTempDir dir;
        const std::string config =
            dir.write("kvi.conf", kviTestMaplConfig(pathOf("KviTestMaplGoodA"), c.lines));
        KviLogCapture log(KVI_LOG_DBG_H_NUM);
        auto check = [&c] {
            SaHpiInt8T name[8];
            KviCsRwLockT *lock = nullptr;
            if (kviDsMaplManagerLoadMapls() != SA_OK)
                return 1;
            if (kviDsMaplManagerGetMaplName(c.slots - 1, sizeof name, name) !=
                SA_ERR_HPI_NOT_PRESENT)
                return 2;
            if (kviDsMaplManagerGetMaplName(c.slots, sizeof name, name) != SA_ERR_HPI_INVALID)
                return 3;
            if (kviDsMaplManagerUnprotectedGetMaplLock(0, c.locks - 1, &lock) != SA_OK)
                return 4;
            return kviDsMaplManagerUnprotectedGetMaplLock(0, c.locks, &lock) ==
                           SA_ERR_HPI_NOT_PRESENT
                       ? 0
                       : 5;
        };
        EXPECT_EXIT(exit(freshManager(config, check)), testing::ExitedWithCode(0), "");
        EXPECT_TRUE(log.contains("Max MAPLS supported: " + std::to_string(c.slots)));
        for (const std::string &message : c.messages)
            EXPECT_TRUE(log.contains(message)) << message;
        if (c.messages.empty()) {
            EXPECT_FALSE(log.contains("Invalid value"));
            EXPECT_FALSE(log.contains("Unexpected return code"));
        }
    }
}

TEST(MaplManagerDeathTest, MorePluginsListedThanSlotsEndsTheProcess)
{
    KviTempDir dir;
    const std::string config = dir.write(
        "kvi.conf", kviTestMaplConfig(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB"}),
                                      "max_mapl_count = \"1\"\n"));
    KviLogCapture log(KVI_LOG_INFO_NUM);
    EXPECT_EXIT(exit(freshManager(config, [] { return 20 + kviDsMaplManagerLoadMapls(); })),
                testing::ExitedWithCode(1), "");
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM,
                                "Unable to add MAPL.  Max of 1 is already present"));
    EXPECT_TRUE(log.contains("TestMapl KviTestMaplGoodA initialized in slot 0"));
    EXPECT_FALSE(log.contains("TestMapl KviTestMaplGoodB initialized"));
}

TEST(MaplManagerDeathTest, FinalizeStopsFollowingTheConfigurationButKeepsThePlugins)
{
    KviTempDir dir;
    const std::string config =
        dir.write("kvi.conf", kviTestMaplConfig(pathOf("KviTestMaplGoodA"), LIMITS));
    KviLogCapture log(KVI_LOG_INFO_NUM);
    auto check = [] {
        const KviCsCfgCallback callback = kviDsMaplManagerConfigFileCallback;
        if (kviCsConfigRegister(callback, nullptr) != SA_ERR_HPI_DUPLICATE)
            return 1;
        if (kviDsMaplManagerLoadMapls() != SA_OK || kviDsMaplManagerFinalize() != SA_OK)
            return 2;
        if (kviCsConfigUnregister(callback, nullptr) != SA_ERR_HPI_NOT_PRESENT)
            return 3;
        if (kviTestMaplNameIn(0) != pathOf("KviTestMaplGoodA"))
            return 4;
        // Only the callback was dropped, and only once; the table stays.
        if (kviDsMaplManagerFinalize() != SA_OK)
            return 5;
        return kviDsMaplManagerInitialize() == SA_ERR_HPI_DUPLICATE ? 0 : 6;
    };
    EXPECT_EXIT(exit(freshManager(config, check)), testing::ExitedWithCode(0), "");
    EXPECT_TRUE(log.contains("Unegistration of callback failed!"));
    EXPECT_TRUE(log.contains("Function called more than once-- bad"));
}

TEST(MaplManagerDeathTest, TablesThatCannotBeAllocatedEndTheProcess)
{
    KviTempDir dir;
    const struct {
        const char *lines;
        SaHpiInt32T failAllocation; // counted from the manager's initialization
        const char *fatalLine;
    } cases[] = {
        {LIMITS, 1, "Unable to allocate memory for MaplList"},
        // No upper bound: -1 asks for more slots than can be allocated.
        {"max_mapl_count = \"-1\"\n", 0, "Unable to allocate memory for MaplList"},
        {LIMITS, 2, "Unable to allocate memory for the name of Mapl"},
        {LIMITS, 3, "Unable to allocate memory for 2 Mapl locks"},
        {"max_mapl_rwlocks_count = \"-1\"\n", 0,
         "Unable to allocate memory for 4294967295 Mapl locks"},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.fatalLine);
        const std::string config =
            dir.write("kvi.conf", kviTestMaplConfig(pathOf("KviTestMaplGoodA"), c.lines));
        KviLogCapture log(KVI_LOG_ERR_FATAL_NUM);
        auto child = [&] {
            if (kviCsConfigInit(SAHPI_FALSE, config.c_str()) != SA_OK)
                return 10;
            // The first allocation of initialization is the slot table; the
            // registration of the callback and of a plug-in follow.
            kviCsMemoryFailNthAllocation(c.failAllocation);
            if (kviDsMaplManagerInitialize() != SA_OK)
                return 11;
            return 20 + kviDsMaplManagerLoadMapls();
        };
        EXPECT_EXIT(exit(child()), testing::ExitedWithCode(1), "");
        EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM, c.fatalLine));
    }
}

// ---- One manager for the rest of the process ----

class MaplManagerTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        static KviTempDir dir;
        configDir = &dir;
        const std::string config = dir.write("kvi.conf", kviTestMaplConfig("", LIMITS));
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, config.c_str()), SA_OK);
        ASSERT_EQ(kviCsDomainInitialize(), SA_OK);
        ASSERT_EQ(kviCsRptInitialize(), SA_OK);
        ASSERT_EQ(kviCsRdrInitialize(), SA_OK);
        ASSERT_EQ(kviDsMaplManagerInitialize(), SA_OK);
    }

    void TearDown() override { EXPECT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK); }

    // Lists the plug-ins in the configuration file, loads it afresh and runs
    // the manager's configuration callback, as a change of the file would.
    static void listMapls(const std::string &Modules, std::string_view More = LIMITS)
    {
        writeConfig(kviTestMaplConfig(Modules, More));
        kviDsMaplManagerConfigFileCallback();
    }

    static void writeConfig(const std::string &Text)
    {
        const std::string path = configDir->write("kvi.conf", Text);
        kviCsConfigFinalize();
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, path.c_str()), SA_OK);
    }

    static SaHpiResourceIdT discoveredBy(std::string_view Name)
    {
        EXPECT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);
        return KviLoadedMapl(pathOf(Name)).resource();
    }

    static bool inRpt(SaHpiResourceIdT Rid)
    {
        SaHpiBoolT active = SAHPI_FALSE;
        return kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, Rid, nullptr, &active, nullptr) ==
               SA_OK;
    }

    static inline KviTempDir *configDir = nullptr;
};

TEST_F(MaplManagerTest, ListedPluginsTakeTheLowestSlotsInListOrderAndANameListedTwiceLoadsOnce)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    listMapls(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB", "KviTestMaplGoodA"}));
    EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_OK); // nothing left to do
    EXPECT_EQ(kviTestMaplNameIn(0), pathOf("KviTestMaplGoodA"));
    EXPECT_EQ(kviTestMaplNameIn(1), pathOf("KviTestMaplGoodB"));
    EXPECT_EQ(kviTestMaplNameIn(2), "");
    EXPECT_EQ(KviLoadedMapl(pathOf("KviTestMaplGoodB")).slot(), 1u);
    EXPECT_EQ(log.matching("TestMapl KviTestMaplGoodA initialized in slot 0").size(), 1u);
    EXPECT_EQ(log.matching("initialized in slot").size(), 2u);
}

TEST_F(MaplManagerTest, EveryBadPluginIsRefusedWithItsMessageAndTheGoodOnesStillLoad)
{
    KviTempDir notALibrary;
    struct Case {
        std::string file;
        std::string message;
    };
    auto plugin = [](const char *Name, const char *Format) {
        const std::string path = pathOf(Name);
        char text[4096];
        snprintf(text, sizeof text, Format, path.c_str());
        return Case{path, text};
    };
    const Case cases[] = {
        {"/nonexistent/libKviNothing.so",
         "dlopen failed to open /nonexistent/libKviNothing.so.  Returned "},
        {notALibrary.path(), "dlopen failed to open " + notALibrary.path() + ".  Returned "},
        {"libm.so.6", "dlsym failed to find KviModuleInitTable in libm.so.6.  Returned "},
        plugin("KviTestMaplWrongSymbol",
               "dlsym failed to find KviModuleInitTable in %s.  Returned "),
        plugin("KviTestMaplNullSymbol", "dlsym returned a NULL KviModuleInitTable in %s."),
        plugin("KviTestMaplNullGetVersion", "KviModuleInitTable.GetVersion is NULL in %s."),
        plugin("KviTestMaplVersionFails", "GetVersion Failed!"),
        plugin("KviTestMaplVersion100",
               "Unable to load Mapl %s - MaplVersion is 0x100, MaplManager version is 0x101"),
        plugin("KviTestMaplVersion102",
               "Unable to load Mapl %s - MaplVersion is 0x102, MaplManager version is 0x101"),
        plugin("KviTestMaplNullDiscover", "KviModuleInitTable.ResourcesDiscover is NULL in %s."),
        plugin("KviTestMaplNullInit", "moduleInitTable.MaplInitialization is NULL in %s."),
        plugin("KviTestMaplNullFini", "moduleInitTable.MaplFinalization is NULL in %s."),
        // With several members missing, the first in the checking order is named.
        plugin("KviTestMaplNullAllButVersion",
               "KviModuleInitTable.ResourcesDiscover is NULL in %s."),
        plugin("KviTestMaplNullInitFini", "moduleInitTable.MaplInitialization is NULL in %s."),
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.file);
        KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
        listMapls(c.file + ";" + pathOf("KviTestMaplGoodA"));
        EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, c.message));
        EXPECT_TRUE(log.contains("Can't add MAPL " + c.file));
        EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
        EXPECT_EQ(kviTestMaplNameIn(0), pathOf("KviTestMaplGoodA"));
        EXPECT_EQ(kviTestMaplNameIn(1), "");
        if (c.file.find("/plugins/") != std::string::npos) {
            EXPECT_FALSE(KviLoadedMapl(c.file).loaded()) << "refused plug-in left open";
        }
        EXPECT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    }
}

TEST_F(MaplManagerTest, PluginWhoseStartFailsKeepsItsSlotUntilItIsNoLongerListed)
{
    const std::string failing = pathOf("KviTestMaplInitFails");
    KviLogCapture log(KVI_LOG_INFO_NUM);
    listMapls(failing + ";" + pathOf("KviTestMaplGoodA"));
    EXPECT_TRUE(log.contains("MaplInitialization failed in Mapl " + failing + ".  rc=-1019"));
    EXPECT_TRUE(
        log.contains("kviDsMaplManagerRegisterMapl failed for module " + failing + ".  rc=-1019"));
    EXPECT_FALSE(KviLoadedMapl(failing).loaded());
    EXPECT_EQ(kviTestMaplNameIn(0), failing);
    EXPECT_EQ(kviTestMaplNameIn(1), pathOf("KviTestMaplGoodA"));

    // Still listed: neither retried nor called again.
    EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    EXPECT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);
    EXPECT_EQ(log.matching("TestMapl KviTestMaplInitFails initialized").size(), 1u);
    EXPECT_TRUE(log.contains("Unable to call discover-- Null FnPtr for Mapl[0]"));

    listMapls(pathOf("KviTestMaplGoodA"));
    EXPECT_EQ(kviTestMaplNameIn(0), "");
    EXPECT_TRUE(log.contains("Unloading Mapl " + failing));
    EXPECT_FALSE(log.contains("TestMapl KviTestMaplInitFails finalized"));
}

TEST_F(MaplManagerTest, LoadMaplReturnsTheCodeOfAFailedStart)
{
    EXPECT_EQ(kviDsMaplManagerLoadMapl(pathOf("KviTestMaplInitFails").c_str()),
              SA_ERR_HPI_INITIALIZING);
    EXPECT_EQ(kviDsMaplManagerLoadMapl(pathOf("KviTestMaplVersion100").c_str()), SA_ERR_HPI_ERROR);
    EXPECT_EQ(kviDsMaplManagerLoadMapl(pathOf("KviTestMaplGoodB").c_str()), SA_OK);
    EXPECT_EQ(kviTestMaplNameIn(1), pathOf("KviTestMaplGoodB"));
}

TEST_F(MaplManagerTest, DiscoveryRunsEveryPluginAndGoesOnAfterAFailure)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    listMapls(kviTestMaplList({"KviTestMaplDiscoverFails", "KviTestMaplGoodA"}));
    const SaHpiResourceIdT rid = discoveredBy("KviTestMaplGoodA");
    EXPECT_TRUE(log.contains("TestMapl KviTestMaplDiscoverFails fails discovery"));
    EXPECT_TRUE(log.contains("Mapl[0] Discover returned -1020"));
    EXPECT_NE(rid, 0u);
    EXPECT_TRUE(inRpt(rid));
}

TEST_F(MaplManagerTest, UnlistedPluginLosesItsResourcesIsFinalizedAndClosedAndItsSlotIsReused)
{
    listMapls(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB"}));
    const SaHpiResourceIdT rid = discoveredBy("KviTestMaplGoodA");
    ASSERT_TRUE(inRpt(rid));
    KviLogCapture log(KVI_LOG_INFO_NUM);
    listMapls(pathOf("KviTestMaplGoodB"));
    EXPECT_FALSE(inRpt(rid));
    EXPECT_FALSE(kviTestMaplLoaded("KviTestMaplGoodA"));
    EXPECT_EQ(kviTestMaplNameIn(0), "");
    // Resources first, while the plug-in can still free what it attached.
    const std::vector<std::string> lines = log.lines();
    auto at = [&lines](const std::string &Text) {
        for (size_t i = 0; i < lines.size(); i++)
            if (lines[i].find(Text) != std::string::npos)
                return i;
        return lines.size();
    };
    const size_t removed = at("TestMapl KviTestMaplGoodA removed rid=" + std::to_string(rid));
    const size_t finalized = at("TestMapl KviTestMaplGoodA finalized");
    const size_t unloading = at("Unloading Mapl " + pathOf("KviTestMaplGoodA"));
    EXPECT_LT(removed, finalized);
    EXPECT_LT(finalized, unloading);
    EXPECT_LT(unloading, lines.size());

    listMapls(kviTestMaplList({"KviTestMaplGoodB", "KviTestMaplSlow"}));
    EXPECT_EQ(kviTestMaplNameIn(0), pathOf("KviTestMaplSlow"));
}

TEST_F(MaplManagerTest, LoadDiscoverUnloadGivesBackEveryBlock)
{
    listMapls(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB"}));
    ASSERT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    const SaHpiInt32T baseline = kviTestLiveBlocks();
    ASSERT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    ASSERT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);
    EXPECT_GT(kviTestLiveBlocks(), baseline);
    ASSERT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), baseline);
}

TEST_F(MaplManagerTest, GetMaplLockWantsTheMasterLockHeldForReading)
{
    listMapls(pathOf("KviTestMaplGoodA"));
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    KviCsRwLockT *master = nullptr;
    ASSERT_EQ(kviDsMaplManagerGetMaplMasterLock(&master), SA_OK);
    KviCsRwLockT *lock = nullptr;
    EXPECT_EQ(kviDsMaplManagerGetMaplLock(0, 0, &lock), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("The caller to kviDsMaplManagerGetMaplLock did not perform a read "
                             "lock on the MaplMasterLock"));
    EXPECT_EQ(lock, nullptr);

    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(master, 1000), SA_OK);
    EXPECT_EQ(kviDsMaplManagerGetMaplLock(0, 1, &lock), SA_OK);
    KviCsRwLockT *same = nullptr;
    EXPECT_EQ(kviDsMaplManagerUnprotectedGetMaplLock(0, 1, &same), SA_OK);
    EXPECT_EQ(lock, same);
    const struct {
        SaHpiUint32T mapl, lock;
        const char *message;
    } refused[] = {
        {0, 2, "Lock 2 out of range"},
        {1, 0, "Mapl 1 not in use"},
        {3, 0, "Mapl 3 out of range"},
    };
    for (const auto &r : refused) {
        EXPECT_EQ(kviDsMaplManagerGetMaplLock(r.mapl, r.lock, &lock), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviDsMaplManagerUnprotectedGetMaplLock(r.mapl, r.lock, &lock),
                  SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(log.matching(r.message).size(), 2u) << r.message;
    }
    EXPECT_EQ(kviDsMaplManagerGetMaplLock(0, 0, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("MaplLock pointer is NULL."));
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(master), SA_OK);
    // The refused check gave the master lock back.
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_WR_LOCK(master), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(master), SA_OK);
}

TEST_F(MaplManagerTest, GetMaplNameNeedsRoomForTheTerminator)
{
    const std::string path = pathOf("KviTestMaplGoodA");
    listMapls(path);
    std::vector<SaHpiInt8T> buffer(path.size() + 1, 'x');
    EXPECT_EQ(kviDsMaplManagerGetMaplName(0, path.size(), buffer.data()),
              SA_ERR_HPI_DATA_EX_LIMITS);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(0, path.size() + 1, buffer.data()), SA_OK);
    EXPECT_EQ(std::string(reinterpret_cast<const char *>(buffer.data())), path);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(1, buffer.size(), buffer.data()), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(3, buffer.size(), buffer.data()), SA_ERR_HPI_INVALID);
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(0, 10, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Buffer pointer is NULL."));
}

TEST_F(MaplManagerTest, InternalStepsRefuseWhatTheyCannotDo)
{
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    KviMaplInitTableT table{};
    int handle = 0;
    EXPECT_EQ(kviDsMaplManagerRegisterMapl(nullptr, nullptr, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviDsMaplManagerRegisterMapl("x", nullptr, &table), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviDsMaplManagerRegisterMapl("x", &handle, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    const std::vector<std::string> nulls = {"FileName pointer is NULL.",
                                            "LibraryHandle pointer is NULL.",
                                            "ModuleInitTable pointer is NULL."};
    for (const std::string &message : nulls)
        EXPECT_EQ(log.matching(message).size(), 1u) << message;
    EXPECT_EQ(kviDsMaplManagerUnloadMapl(3), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Invalid Mapl value 3 passed in.  Bad."));
    EXPECT_EQ(kviDsMaplManagerUnloadMapl(2), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Request to remove Mapl 2, but Mapl not in use!"));
}

TEST_F(MaplManagerTest, ModuleListThatCannotBeReadLeavesTheLoadedSetAlone)
{
    listMapls(pathOf("KviTestMaplGoodA"));
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    const struct {
        std::string config;
        SaErrorT rc;
        const char *message;
    } cases[] = {
        {LIMITS, SA_ERR_HPI_NOT_PRESENT, "Config file doesn't have mapl_modules specified."},
        {kviTestMaplConfig(std::string(2048, 'm'), LIMITS), SA_ERR_HPI_DATA_TRUNCATED,
         "Can't get module list from config file-- too long."},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.message);
        writeConfig(c.config);
        EXPECT_EQ(kviDsMaplManagerLoadMapls(), c.rc);
        EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, c.message));
        EXPECT_EQ(kviTestMaplNameIn(0), pathOf("KviTestMaplGoodA"));
    }
}

TEST_F(MaplManagerTest, LoadGivesUpWhenTheMasterLockStaysTaken)
{
    listMapls(pathOf("KviTestMaplGoodA"));
    KviCsRwLockT *master = nullptr;
    ASSERT_EQ(kviDsMaplManagerGetMaplMasterLock(&master), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(master, 1000), SA_OK);
    KviLogCapture log(KVI_LOG_WARN_NUM);
    EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_WARN_NUM, "Unable to acquire MaplMasterLock"));
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(master), SA_OK);
    KviCsRwLockT *out = nullptr;
    EXPECT_EQ(kviDsMaplManagerGetMaplMasterLock(&out), SA_OK);
    EXPECT_EQ(out, master);
    EXPECT_EQ(kviDsMaplManagerGetMaplMasterLock(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("MaplMasterLock pointer is NULL."));
}

} // namespace
