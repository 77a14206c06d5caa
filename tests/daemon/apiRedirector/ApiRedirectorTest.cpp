#include <gtest/gtest.h>

#include <cstdio>
#include <string>
#include <vector>

#include "../maplManager/KviTestMapls.h"
#include "core/SaHpi/rpt/RptTestSupport.h"
#include "support/KviTestSupport.h"

namespace
{
class DefaultRemovalSlotsTest : public ResourceModelTest
{
};

// Nothing hung on the resource or record: nothing to free, and no complaint.
TEST_F(DefaultRemovalSlotsTest, FreeTheUserBlockAndLogTheResource)
{
    SaHpiInt32T blocks = liveBlocks();
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_IN_NUM);
    EXPECT_EQ(kviDsDefaultRptResourcesRemove(0, 5, nullptr, KVI_CS_MALLOC(16), SAHPI_TRUE, nullptr),
              SA_OK);
    EXPECT_EQ(kviDsDefaultRdrResourcesRemove(0, 6, nullptr, KVI_CS_MALLOC(16), nullptr), SA_OK);
    EXPECT_EQ(liveBlocks(), blocks);
    EXPECT_TRUE(log.contains("domain=0, rid=5, Active=1"));
    EXPECT_TRUE(log.contains("domain=0, rid=6"));
    log.clear();
    EXPECT_EQ(kviDsDefaultRptResourcesRemove(0, 5, nullptr, nullptr, SAHPI_FALSE, nullptr), SA_OK);
    EXPECT_EQ(kviDsDefaultRdrResourcesRemove(0, 6, nullptr, nullptr, nullptr), SA_OK);
    EXPECT_FALSE(log.contains("Ptr is NULL."));
}

// ---- Lifecycle and the call gate ----
//
// Every scenario runs in a child forked from this process before anything in
// it touched the library (googletest runs the DeathTest suites first), so each
// one meets the library as just loaded. The child's expectations print their
// own failures and decide its exit status; the parent reads the log.

std::string lifecycleConfig(const KviTempDir &Dir, std::string_view Modules,
                            bool WithModules = true)
{
    const std::string rest = "KviNvStorageDir = \"" + Dir.file("nv") +
                             "\"\nmax_mapl_count = \"4\"\nmax_mapl_rwlocks_count = \"2\"\n";
    return Dir.write("kvi.conf", WithModules ? kviTestMaplConfig(Modules, rest) : rest);
}

// The child's failed expectations, on its standard error where the parent
// shows them; the exit status says whether there were any.
int reportChildFailures()
{
    const testing::TestResult *result =
        testing::UnitTest::GetInstance()->current_test_info()->result();
    for (int i = 0; i < result->total_part_count(); i++) {
        const testing::TestPartResult &part = result->GetTestPartResult(i);
        if (part.failed())
            fprintf(stderr, "%s:%d: %s\n", part.file_name(), part.line_number(), part.message());
    }
    return testing::Test::HasFailure() ? 1 : 0;
}

template <typename Scenario> void inFreshLibrary(const std::string &Config, Scenario scenario)
{
    EXPECT_EXIT(
        {
            EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, Config.c_str()), SA_OK);
            EXPECT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
            scenario();
            exit(reportChildFailures());
        },
        testing::ExitedWithCode(0), "");
}

// The steps announced by initialize and finalize, in the order they ran.
std::vector<std::string> stepsCalled(const KviLogCapture &Log)
{
    std::vector<std::string> steps;
    for (const std::string &line : Log.matching("Calling kvi"))
        steps.push_back(line.substr(line.find("Calling ") + 8));
    return steps;
}

TEST(ApiLifecycleDeathTest, TablesAreSetUpByTheFirstInitializeOnlyTheRestByEveryCycle)
{
    KviTempDir dir;
    const std::string config = lifecycleConfig(dir, kviTestMaplPath("KviTestMaplGoodA"));
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    inFreshLibrary(config, [] {
        SaHpiVersionT version = 0;
        EXPECT_EQ(saHpiInitialize(&version), SA_OK);
        EXPECT_EQ(version, 1u);
        EXPECT_TRUE(kviTestMaplLoaded("KviTestMaplGoodA"));
        EXPECT_EQ(saHpiFinalize(), SA_OK);
        EXPECT_FALSE(kviTestMaplLoaded("KviTestMaplGoodA"));
        const SaHpiInt32T blocks = kviTestLiveBlocks();
        SaHpiSessionIdT session = 0;
        EXPECT_EQ(saHpiInitialize(&version), SA_OK);
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr), SA_OK);
        EXPECT_EQ(saHpiResourcesDiscover(session), SA_OK);
        EXPECT_EQ(saHpiFinalize(), SA_OK);
        EXPECT_EQ(kviTestLiveBlocks(), blocks);
    });
    const std::vector<std::string> expected = {
        "kviCsNonVolatileInitialize()", "kviCsDomainInitialize()",
        "kviCsRptInitialize()",         "kviCsRdrInitialize()",
        "kviCsSessionInitialize()",     "kviCsEventQueueInitialize()",
        "kviDsMaplManagerLoadMapls()",  "kviCsEventQueueFinalize()",
        "kviCsNonVolatileFinalize()",   "kviCsNonVolatileInitialize()",
        "kviCsEventQueueInitialize()",  "kviDsMaplManagerLoadMapls()",
        "kviCsEventQueueFinalize()",    "kviCsNonVolatileFinalize()",
    };
    EXPECT_EQ(stepsCalled(log), expected);
}

TEST(ApiLifecycleDeathTest, FailedInitializeUndoesNothingSoTheStoreItOpenedRefusesTheNextOne)
{
    KviTempDir dir;
    const std::string broken = lifecycleConfig(dir, "", false);
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    inFreshLibrary(broken, [&dir] {
        SaHpiVersionT version = 0;
        SaHpiSessionIdT session = 0;
        EXPECT_EQ(saHpiInitialize(&version), SA_ERR_HPI_ERROR);
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr),
                  SA_ERR_HPI_UNINITIALIZED);
        EXPECT_EQ(saHpiFinalize(), SA_ERR_HPI_UNINITIALIZED);
        kviCsConfigFinalize();
        const std::string fixed = lifecycleConfig(dir, kviTestMaplPath("KviTestMaplGoodA"));
        EXPECT_EQ(kviCsConfigInit(SAHPI_FALSE, fixed.c_str()), SA_OK);
        // The whole sequence runs again, and its first step finds the store
        // still open from the failed attempt.
        EXPECT_EQ(saHpiInitialize(&version), SA_ERR_HPI_ERROR);
        EXPECT_EQ(version, 0u);
    });
    EXPECT_TRUE(
        kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM, "kviDsMaplManagerLoadMapls failed. rc=-1013"));
    EXPECT_TRUE(log.contains("Config file doesn't have mapl_modules specified."));
    EXPECT_TRUE(
        kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM, "kviCsNonVolatileInitialize failed. rc=-1017"));
    EXPECT_EQ(log.matching("Calling kviCsNonVolatileInitialize()").size(), 2u);
    EXPECT_EQ(log.matching("Calling kviCsDomainInitialize()").size(), 1u);
}

// Calls before initialize are refused, and so is the daemon's set-up made a
// second time; a second initialize is a duplicate; null arguments are
// refused first.
TEST(ApiLifecycleDeathTest, CallsBeforeInitializeAndASecondInitializeAreRefused)
{
    KviTempDir dir;
    const std::string config = lifecycleConfig(dir, kviTestMaplPath("KviTestMaplGoodA"));
    KviLogCapture log(KVI_LOG_DBG_H_NUM);
    inFreshLibrary(config, [] {
        SaHpiSessionIdT session = 0;
        EXPECT_EQ(saHpiFinalize(), SA_ERR_HPI_UNINITIALIZED);
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr),
                  SA_ERR_HPI_UNINITIALIZED);
        EXPECT_EQ(saHpiSessionClose(1000), SA_ERR_HPI_UNINITIALIZED);
        EXPECT_EQ(saHpiResourcesDiscover(1000), SA_ERR_HPI_UNINITIALIZED);
        EXPECT_FALSE(kviTestMaplLoaded("KviTestMaplGoodA"));
        EXPECT_EQ(kviDsApiRedirectorInitialize(), SA_ERR_HPI_ERROR);
        SaHpiVersionT version = 0, untouched = 77;
        EXPECT_EQ(saHpiInitialize(&version), SA_OK);
        EXPECT_EQ(saHpiInitialize(&untouched), SA_ERR_HPI_DUPLICATE);
        EXPECT_EQ(untouched, 77u);
        EXPECT_EQ(saHpiInitialize(nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, nullptr, nullptr),
                  SA_ERR_HPI_INVALID_PARAMS);
    });
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_DBG_H_NUM,
                                "Cannot call saHpiFinalize before saHpiInitialize."));
    EXPECT_TRUE(
        kviTestLoggedAt(log, KVI_LOG_ERR_FATAL_NUM, "kviDsMaplManagerInitialize failed. rc=-1017"));
    EXPECT_EQ(log.matching("SaHpi APIs may not be called before saHpiInitialize.").size(), 3u);
    EXPECT_TRUE(kviTestLoggedAt(log, KVI_LOG_WARN_NUM, "Duplicate call to saHpiInitialize."));
    EXPECT_TRUE(log.contains("HpiImplVersion pointer is NULL."));
    EXPECT_TRUE(log.contains("SessionId pointer is NULL."));
    EXPECT_EQ(log.matching("initialized in slot").size(), 1u);
}

TEST(ApiLifecycleDeathTest, SessionsAndDiscoveryPassTheGate)
{
    KviTempDir dir;
    const std::string config =
        lifecycleConfig(dir, kviTestMaplList({"KviTestMaplDiscoverFails", "KviTestMaplGoodA"}));
    KviLogCapture log(KVI_LOG_DBG_H_NUM);
    inFreshLibrary(config, [] {
        SaHpiVersionT version = 0;
        ASSERT_EQ(saHpiInitialize(&version), SA_OK);
        SaHpiSessionIdT session = 0;
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr), SA_OK);
        EXPECT_GE(session, 1000u);
        SaHpiSessionIdT other = 0;
        EXPECT_EQ(saHpiSessionOpen(5, &other, nullptr), SA_ERR_HPI_INVALID_DOMAIN);
        // One plug-in failing its discovery is not the client's failure.
        EXPECT_EQ(saHpiResourcesDiscover(session), SA_OK);
        EXPECT_NE(KviLoadedMapl(kviTestMaplPath("KviTestMaplGoodA")).resource(), 0u);
        EXPECT_EQ(saHpiResourcesDiscover(999), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(saHpiSessionClose(session), SA_OK);
        EXPECT_EQ(saHpiSessionClose(session), SA_ERR_HPI_INVALID_SESSION);

        // Finalize closes every session; the table itself stays.
        SaHpiSessionIdT open = 0;
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &open, nullptr), SA_OK);
        EXPECT_EQ(saHpiFinalize(), SA_OK);
        EXPECT_EQ(saHpiInitialize(&version), SA_OK);
        EXPECT_EQ(saHpiSessionClose(open), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &other, nullptr), SA_OK);
        EXPECT_GT(other, open);
    });
    EXPECT_TRUE(log.contains("kviCsSessionValidate failed. Invalid session 999"));
    EXPECT_TRUE(log.contains("Mapl[0] Discover returned -1020"));
}

} // namespace
