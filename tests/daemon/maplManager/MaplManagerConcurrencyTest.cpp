// The plug-in manager following its configuration file on the watcher's
// thread, and unloading under a call that is running in the plug-in. Once the
// file has changed the watcher reloads it about once a second, so from the
// first change on only the watcher reads the configuration here.
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <string>
#include <thread>

#include "KviTestMapls.h"
#include "support/KviTestSupport.h"

namespace
{

class MaplManagerWatcherTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        static KviTempDir dir;
        static KviLogCapture capture(KVI_LOG_INFO_NUM | KVI_LOG_FUNC_IN_NUM);
        configDir = &dir;
        log = &capture;
        const std::string config = dir.write(
            "kvi.conf", kviTestMaplConfig(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplGoodB"}),
                                          "max_mapl_count = \"3\"\n"));
        firstTime = std::filesystem::last_write_time(config);
        ASSERT_EQ(kviCsDomainInitialize(), SA_OK);
        ASSERT_EQ(kviCsRptInitialize(), SA_OK);
        ASSERT_EQ(kviCsRdrInitialize(), SA_OK);
        ASSERT_EQ(kviCsConfigInit(SAHPI_TRUE, config.c_str()), SA_OK);
        ASSERT_EQ(kviDsMaplManagerInitialize(), SA_OK);
        // The file is unchanged yet, so the watcher only looks at its time.
        ASSERT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    }

    static void TearDownTestSuite()
    {
        // The callback cannot be dropped while the watcher is running it.
        kviTestWaitFor([] { return kviDsMaplManagerFinalize() == SA_OK; });
        kviCsConfigFinalize();
        EXPECT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    }

    // Replaces the file in one step, with a modification time of its own.
    static void listMapls(const std::string &Modules)
    {
        const std::string next = configDir->write(
            "kvi.conf.next", kviTestMaplConfig(Modules, "max_mapl_count = \"3\"\n"));
        changes++;
        std::filesystem::last_write_time(next, firstTime + std::chrono::seconds(10 * changes));
        std::filesystem::rename(next, configDir->file("kvi.conf"));
    }

    static bool slotHolds(SaHpiUint32T MaplNum, std::string_view Name)
    {
        return kviTestMaplNameIn(MaplNum) == (Name.empty() ? "" : kviTestMaplPath(Name));
    }

    static SaHpiResourceIdT discoveredBy(std::string_view Name)
    {
        EXPECT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);
        return KviLoadedMapl(kviTestMaplPath(Name)).resource();
    }

    static inline KviTempDir *configDir = nullptr;
    static inline KviLogCapture *log = nullptr;
    static inline std::filesystem::file_time_type firstTime;
    static inline int changes = 0;
};

TEST_F(MaplManagerWatcherTest, ChangedFileUnloadsTheUnlistedAndLoadsTheNewIntoTheLowestFreeSlot)
{
    ASSERT_TRUE(kviTestWaitFor([] { return slotHolds(0, "KviTestMaplGoodA"); }));
    const SaHpiResourceIdT rid = discoveredBy("KviTestMaplGoodA");
    ASSERT_NE(rid, 0u);

    listMapls(kviTestMaplPath("KviTestMaplGoodB"));
    ASSERT_TRUE(kviTestWaitFor([] { return slotHolds(0, ""); }));
    EXPECT_TRUE(slotHolds(1, "KviTestMaplGoodB"));
    EXPECT_TRUE(log->contains("TestMapl KviTestMaplGoodA removed rid=" + std::to_string(rid)));
    EXPECT_TRUE(log->contains("TestMapl KviTestMaplGoodA finalized"));
    EXPECT_TRUE(log->contains("kviDsMaplManagerConfigFileCallback()"));
    EXPECT_FALSE(kviTestMaplLoaded("KviTestMaplGoodA"));

    listMapls(kviTestMaplList({"KviTestMaplGoodB", "KviTestMaplGoodA"}));
    ASSERT_TRUE(kviTestWaitFor([] { return slotHolds(0, "KviTestMaplGoodA"); }));
    EXPECT_TRUE(slotHolds(1, "KviTestMaplGoodB"));
}

TEST_F(MaplManagerWatcherTest, UnloadWaitsForTheCallRunningInThePlugin)
{
    listMapls(kviTestMaplList({"KviTestMaplGoodB", "KviTestMaplSlow"}));
    ASSERT_TRUE(kviTestWaitFor([] { return slotHolds(0, "KviTestMaplSlow"); }));
    const SaHpiResourceIdT rid = discoveredBy("KviTestMaplSlow");
    ASSERT_NE(rid, 0u);
    const std::string slow = kviTestMaplPath("KviTestMaplSlow");

    SaErrorT callResult = SA_ERR_HPI_ERROR;
    std::thread call([&] { callResult = kviTestCallIntoPlugin(rid); });
    ASSERT_TRUE(kviTestWaitFor([&] { return KviLoadedMapl(slow).slowCallsRunning() == 1; }));
    log->clear();

    listMapls(kviTestMaplPath("KviTestMaplGoodB"));
    // The unload has begun and stays blocked on the plug-in's lock.
    EXPECT_TRUE(kviTestWaitFor([] {
        for (const std::string &line : log->matching("kviDsMaplManagerUnloadMapl()"))
            if (line.find("MaplNum: 0") != std::string::npos)
                return true;
        return false;
    }));
    usleep(200000);
    EXPECT_FALSE(log->contains("TestMapl KviTestMaplSlow finalized"));
    EXPECT_EQ(KviLoadedMapl(slow).slowCallsRunning(), 1);

    KviLoadedMapl(slow).releaseSlowCalls();
    call.join();
    EXPECT_EQ(callResult, SA_OK);
    EXPECT_TRUE(kviTestWaitFor([] {
        return log->contains("TestMapl KviTestMaplSlow finalized, slow calls running 0 finished 1");
    }));
    EXPECT_TRUE(kviTestWaitFor([] { return slotHolds(0, ""); }));
}

} // namespace
