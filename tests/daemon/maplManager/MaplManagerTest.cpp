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
const std::string goodA = kviTestMaplPath("KviTestMaplGoodA");

// ---- From a fresh process ----

// Runs Check in a child with the configuration Lines (after a plug-in list
// of GoodA) and a fresh manager; the child's exit status must be Status, and
// a step that fails before Check exits with 10 or 11. AllocationToFail, when
// not 0, is counted from the manager's initialization.
template <typename Check>
void inFreshManager(const std::string &Lines, int Status, Check check,
                    SaHpiInt32T AllocationToFail = 0, const std::string &Modules = goodA)
{
    KviTempDir dir;
    const std::string config = dir.write("kvi.conf", kviTestMaplConfig(Modules, Lines));
    auto child = [&] {
        if (kviCsConfigInit(SAHPI_FALSE, config.c_str()) != SA_OK)
            return 10;
        kviCsMemoryFailNthAllocation(AllocationToFail);
        if (kviDsMaplManagerInitialize() != SA_OK)
            return 11;
        return check();
    };
    EXPECT_EXIT(exit(child()), testing::ExitedWithCode(Status), "");
}

TEST(MaplManagerDeathTest, EveryOperationIsRefusedBeforeInitialize)
{
    KviLogCapture log(KVI_LOG_WARN_NUM);
    auto child = [] {
        KviCsRwLockT *lock = nullptr;
        for (SaErrorT rc :
             {kviDsMaplManagerLoadMapls(), kviDsMaplManagerUnloadAllMapls(),
              kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID),
              kviDsMaplManagerGetMaplLock(0, 0, &lock),
              kviDsMaplManagerUnprotectedGetMaplLock(0, 0, &lock),
              kviDsMaplManagerGetMaplMasterLock(&lock), kviDsMaplManagerUnloadMapl(0)})
            if (rc != SA_ERR_HPI_UNINITIALIZED)
                return 1;
        return kviDsMaplManagerFinalize() == SA_ERR_HPI_INVALID_REQUEST ? 0 : 2;
    };
    EXPECT_EXIT(exit(child()), testing::ExitedWithCode(0), "");
    EXPECT_EQ(log.matching("MaplManager has not been initialized").size(), 7u);
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_NONFATAL_NUM,
                                "kviDsMaplManagerFinalize called when not initalized"));
}

// A limit that is not a positive number falls back to ten, with a word why;
// a number is read as far as it goes.
TEST(MaplManagerDeathTest, LimitsComeFromTheConfigurationWithTenAsTheFallback)
{
    const struct {
        const char *lines;
        SaHpiUint32T slots, locks;
        std::vector<std::string> messages;
    } cases[] = {
        {"", 10, 10, {}},
        {LIMITS, 3, 2, {}},
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
        {"max_mapl_count = \"12abc\"\n", 12, 10, {}},
        {"max_mapl_count = \"123456789012345678901234567890\"\n",
         10,
         10,
         {"Unexpected return code of -1008 when recovering max_mapl_count"}},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.lines);
        KviLogCapture log(KVI_LOG_DBG_H_NUM);
        inFreshManager(c.lines, 0, [&c] {
            SaHpiInt8T name[8];
            KviCsRwLockT *lock = nullptr;
            return kviDsMaplManagerLoadMapls() != SA_OK                                          ? 1
                   : kviDsMaplManagerGetMaplName(c.slots - 1, 8, name) != SA_ERR_HPI_NOT_PRESENT ? 2
                   : kviDsMaplManagerGetMaplName(c.slots, 8, name) != SA_ERR_HPI_INVALID         ? 3
                   : kviDsMaplManagerUnprotectedGetMaplLock(0, c.locks - 1, &lock) != SA_OK      ? 4
                   : kviDsMaplManagerUnprotectedGetMaplLock(0, c.locks, &lock) !=
                           SA_ERR_HPI_NOT_PRESENT
                       ? 5
                       : 0;
        });
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
    KviLogCapture log(KVI_LOG_INFO_NUM);
    inFreshManager(
        "max_mapl_count = \"1\"\n", 1, [] { return 20 + kviDsMaplManagerLoadMapls(); }, 0,
        kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB"}));
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM,
                                "Unable to add MAPL.  Max of 1 is already present"));
    EXPECT_TRUE(log.contains("TestMapl KviTestMaplGoodA initialized in slot 0"));
    EXPECT_FALSE(log.contains("TestMapl KviTestMaplGoodB initialized"));
}

// Finalize drops the configuration callback, once; the table stays.
TEST(MaplManagerDeathTest, FinalizeStopsFollowingTheConfigurationButKeepsThePlugins)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    inFreshManager(LIMITS, 0, [] {
        const KviCsCfgCallback callback = kviDsMaplManagerConfigFileCallback;
        return kviCsConfigRegister(callback, nullptr) != SA_ERR_HPI_DUPLICATE                ? 1
               : kviDsMaplManagerLoadMapls() != SA_OK || kviDsMaplManagerFinalize() != SA_OK ? 2
               : kviCsConfigUnregister(callback, nullptr) != SA_ERR_HPI_NOT_PRESENT          ? 3
               : kviTestMaplNameIn(0) != goodA                                               ? 4
               : kviDsMaplManagerFinalize() != SA_OK                                         ? 5
               : kviDsMaplManagerInitialize() != SA_ERR_HPI_DUPLICATE                        ? 6
                                                                                             : 0;
    });
    EXPECT_TRUE(log.contains("Unegistration of callback failed!"));
    EXPECT_TRUE(log.contains("Function called more than once-- bad"));
}

// The first allocation of initialization is the slot table; the names and
// the lock pool follow. A limit of -1 asks for more than can be allocated.
TEST(MaplManagerDeathTest, TablesThatCannotBeAllocatedEndTheProcess)
{
    const std::tuple<const char *, SaHpiInt32T, const char *> cases[] = {
        {LIMITS, 1, "Unable to allocate memory for MaplList"},
        {"max_mapl_count = \"-1\"\n", 0, "Unable to allocate memory for MaplList"},
        {LIMITS, 2, "Unable to allocate memory for the name of Mapl"},
        {LIMITS, 3, "Unable to allocate memory for 2 Mapl locks"},
        {"max_mapl_rwlocks_count = \"-1\"\n", 0,
         "Unable to allocate memory for 4294967295 Mapl locks"},
    };
    for (auto [lines, failing, fatalLine] : cases) {
        SCOPED_TRACE(fatalLine);
        KviLogCapture log(KVI_LOG_ERR_FATAL_NUM);
        inFreshManager(
            lines, 1, [] { return 20 + kviDsMaplManagerLoadMapls(); }, failing);
        EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM, fatalLine));
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
    static void listMapls(const std::string &Modules)
    {
        writeConfig(kviTestMaplConfig(Modules, LIMITS));
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
        return KviLoadedMapl(kviTestMaplPath(Name)).resource();
    }

    static bool inRpt(SaHpiResourceIdT Rid)
    {
        SaHpiBoolT active = SAHPI_FALSE;
        return kviCsRptEntryGetByRid(0, Rid, nullptr, &active, nullptr) == SA_OK;
    }

    static inline KviTempDir *configDir = nullptr;
};

TEST_F(MaplManagerTest, ListedPluginsTakeTheLowestSlotsInListOrderAndANameListedTwiceLoadsOnce)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    listMapls(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB", "KviTestMaplGoodA"}));
    EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_OK); // nothing left to do
    EXPECT_EQ(kviTestMaplNameIn(0), goodA);
    EXPECT_EQ(kviTestMaplNameIn(1), kviTestMaplPath("KviTestMaplGoodB"));
    EXPECT_EQ(kviTestMaplNameIn(2), "");
    EXPECT_EQ(KviLoadedMapl(kviTestMaplPath("KviTestMaplGoodB")).slot(), 1u);
    EXPECT_EQ(log.matching("TestMapl KviTestMaplGoodA initialized in slot 0").size(), 1u);
    EXPECT_EQ(log.matching("initialized in slot").size(), 2u);
}

// Missing files and directories, libraries that are no plug-ins and plug-ins
// with a broken table are refused, each with its message, and left closed.
TEST_F(MaplManagerTest, EveryBadPluginIsRefusedWithItsMessageAndTheGoodOnesStillLoad)
{
    KviTempDir notALibrary;
    auto plugin = [](const char *Name, const char *Format) {
        const std::string path = kviTestMaplPath(Name);
        char text[4096];
        snprintf(text, sizeof text, Format, path.c_str());
        return std::pair<std::string, std::string>{path, text};
    };
    const std::pair<std::string, std::string> cases[] = {
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
    for (const auto &[file, message] : cases) {
        SCOPED_TRACE(file);
        KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
        listMapls(file + ";" + goodA);
        EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, message));
        EXPECT_TRUE(log.contains("Can't add MAPL " + file));
        EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
        EXPECT_EQ(kviTestMaplNameIn(0), goodA);
        EXPECT_EQ(kviTestMaplNameIn(1), "");
        if (file.find("/plugins/") != std::string::npos) {
            EXPECT_FALSE(KviLoadedMapl(file).loaded()) << "refused plug-in left open";
        }
        EXPECT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    }
}

// A plug-in whose start fails is closed but keeps its slot, neither retried
// nor called, until it is no longer listed; a direct load reports the code.
TEST_F(MaplManagerTest, PluginWhoseStartFailsKeepsItsSlotUntilItIsNoLongerListed)
{
    const std::string failing = kviTestMaplPath("KviTestMaplInitFails");
    KviLogCapture log(KVI_LOG_INFO_NUM);
    listMapls(failing + ";" + goodA);
    EXPECT_TRUE(log.contains("MaplInitialization failed in Mapl " + failing + ".  rc=-1019"));
    EXPECT_TRUE(
        log.contains("kviDsMaplManagerRegisterMapl failed for module " + failing + ".  rc=-1019"));
    EXPECT_FALSE(KviLoadedMapl(failing).loaded());
    EXPECT_EQ(kviTestMaplNameIn(0), failing);
    EXPECT_EQ(kviTestMaplNameIn(1), goodA);
    EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    EXPECT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);
    EXPECT_EQ(log.matching("TestMapl KviTestMaplInitFails initialized").size(), 1u);
    EXPECT_TRUE(log.contains("Unable to call discover-- Null FnPtr for Mapl[0]"));
    listMapls(goodA);
    EXPECT_EQ(kviTestMaplNameIn(0), "");
    EXPECT_TRUE(log.contains("Unloading Mapl " + failing));
    EXPECT_FALSE(log.contains("TestMapl KviTestMaplInitFails finalized"));

    EXPECT_EQ(kviDsMaplManagerLoadMapl(failing.c_str()), SA_ERR_HPI_INITIALIZING);
    EXPECT_EQ(kviDsMaplManagerLoadMapl(kviTestMaplPath("KviTestMaplVersion100").c_str()),
              SA_ERR_HPI_ERROR);
}

// Discovery runs every plug-in and goes on after a failure. A plug-in no
// longer listed loses its resources first, while it can still free what it
// attached, then is finalized and closed; its slot goes to the next new one.
// Load, discover and unload give back every block.
TEST_F(MaplManagerTest, UnlistedPluginLosesItsResourcesIsFinalizedAndClosedAndItsSlotIsReused)
{
    const std::string both = kviTestMaplList({"KviTestMaplDiscoverFails", "KviTestMaplGoodA"});
    listMapls(both);
    ASSERT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    const SaHpiInt32T baseline = kviTestLiveBlocks();
    KviLogCapture log(KVI_LOG_INFO_NUM);
    ASSERT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    const SaHpiResourceIdT rid = discoveredBy("KviTestMaplGoodA");
    EXPECT_TRUE(log.contains("TestMapl KviTestMaplDiscoverFails fails discovery"));
    EXPECT_TRUE(log.contains("Mapl[0] Discover returned -1020"));
    ASSERT_TRUE(inRpt(rid));
    log.clear();
    listMapls(kviTestMaplPath("KviTestMaplDiscoverFails"));
    EXPECT_FALSE(inRpt(rid));
    EXPECT_FALSE(kviTestMaplLoaded("KviTestMaplGoodA"));
    EXPECT_EQ(kviTestMaplNameIn(1), "");
    const std::vector<std::string> lines = log.lines();
    auto at = [&lines](const std::string &Text) {
        for (size_t i = 0; i < lines.size(); i++)
            if (lines[i].find(Text) != std::string::npos)
                return i;
        return lines.size();
    };
    EXPECT_LT(at("TestMapl KviTestMaplGoodA removed rid=" + std::to_string(rid)),
              at("TestMapl KviTestMaplGoodA finalized"));
    EXPECT_LT(at("TestMapl KviTestMaplGoodA finalized"), at("Unloading Mapl " + goodA));
    EXPECT_LT(at("Unloading Mapl " + goodA), lines.size());

    listMapls(kviTestMaplList({"KviTestMaplDiscoverFails", "KviTestMaplSlow"}));
    EXPECT_EQ(kviTestMaplNameIn(1), kviTestMaplPath("KviTestMaplSlow"));
    listMapls(both);
    ASSERT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), baseline);
}

// The lock of a plug-in is handed out under the master lock held for
// reading (its unprotected twin needs none); names need room for the
// terminator.
TEST_F(MaplManagerTest, LocksAndNamesAreHandedOutOnlyAsTheContractSays)
{
    listMapls(goodA);
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
    const std::tuple<SaHpiUint32T, SaHpiUint32T, const char *> refused[] = {
        {0, 2, "Lock 2 out of range"}, {1, 0, "Mapl 1 not in use"}, {3, 0, "Mapl 3 out of range"}};
    for (auto [mapl, index, message] : refused) {
        EXPECT_EQ(kviDsMaplManagerGetMaplLock(mapl, index, &lock), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviDsMaplManagerUnprotectedGetMaplLock(mapl, index, &lock),
                  SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(log.matching(message).size(), 2u) << message;
    }
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(master), SA_OK);
    // The refused check gave the master lock back.
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_WR_LOCK(master), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(master), SA_OK);

    std::vector<SaHpiInt8T> buffer(goodA.size() + 1, 'x');
    EXPECT_EQ(kviDsMaplManagerGetMaplName(0, goodA.size(), buffer.data()),
              SA_ERR_HPI_DATA_EX_LIMITS);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(0, goodA.size() + 1, buffer.data()), SA_OK);
    EXPECT_EQ(std::string(reinterpret_cast<const char *>(buffer.data())), goodA);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(1, buffer.size(), buffer.data()), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviDsMaplManagerGetMaplName(3, buffer.size(), buffer.data()), SA_ERR_HPI_INVALID);
}

TEST_F(MaplManagerTest, NullArgumentsAndSlotsOutOfRangeOrUnusedAreRefused)
{
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    KviMaplInitTableT table{};
    int handle = 0;
    const std::pair<SaErrorT, const char *> cases[] = {
        {kviDsMaplManagerRegisterMapl(nullptr, &handle, &table), "FileName pointer is NULL."},
        {kviDsMaplManagerRegisterMapl("x", nullptr, &table), "LibraryHandle pointer is NULL."},
        {kviDsMaplManagerRegisterMapl("x", &handle, nullptr), "ModuleInitTable pointer is NULL."},
        {kviDsMaplManagerGetMaplLock(0, 0, nullptr), "MaplLock pointer is NULL."},
        {kviDsMaplManagerGetMaplMasterLock(nullptr), "MaplMasterLock pointer is NULL."},
        {kviDsMaplManagerGetMaplName(0, 10, nullptr), "Buffer pointer is NULL."},
    };
    for (auto [rc, line] : cases) {
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS) << line;
        EXPECT_EQ(log.matching(line).size(), 1u) << line;
    }
    EXPECT_EQ(kviDsMaplManagerUnloadMapl(3), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Invalid Mapl value 3 passed in.  Bad."));
    EXPECT_EQ(kviDsMaplManagerUnloadMapl(2), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Request to remove Mapl 2, but Mapl not in use!"));
}

// A module list that cannot be read, or a master lock that stays taken,
// leaves the loaded set as it was.
TEST_F(MaplManagerTest, ModuleListThatCannotBeReadOrALockedTableLeavesTheLoadedSetAlone)
{
    listMapls(goodA);
    KviLogCapture log(KVI_LOG_WARN_NUM);
    const std::tuple<std::string, SaErrorT, const char *> cases[] = {
        {LIMITS, SA_ERR_HPI_NOT_PRESENT, "Config file doesn't have mapl_modules specified."},
        {kviTestMaplConfig(std::string(2048, 'm'), LIMITS), SA_ERR_HPI_DATA_TRUNCATED,
         "Can't get module list from config file-- too long."},
    };
    for (const auto &[config, rc, message] : cases) {
        SCOPED_TRACE(message);
        writeConfig(config);
        EXPECT_EQ(kviDsMaplManagerLoadMapls(), rc);
        EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, message));
        EXPECT_EQ(kviTestMaplNameIn(0), goodA);
    }
    listMapls(goodA);
    KviCsRwLockT *master = nullptr;
    ASSERT_EQ(kviDsMaplManagerGetMaplMasterLock(&master), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(master, 1000), SA_OK);
    EXPECT_EQ(kviDsMaplManagerLoadMapls(), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_WARN_NUM, "Unable to acquire MaplMasterLock"));
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(master), SA_OK);
}

} // namespace
