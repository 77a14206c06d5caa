// The call gate with many clients, and with saHpiFinalize holding it while it
// waits for a call that is running in a plug-in.
#include <gtest/gtest.h>

#include <chrono>
#include <string>
#include <thread>
#include <vector>

#include "../maplManager/KviTestMapls.h"
#include "support/KviTestSupport.h"

namespace
{

class ApiGateTest : public testing::Test
{
  protected:
    static void SetUpTestSuite()
    {
        static KviTempDir dir;
        static KviLogCapture capture(KVI_LOG_INFO_NUM | KVI_LOG_FUNC_IN_NUM);
        log = &capture;
        const std::string config = dir.write(
            "kvi.conf", kviTestMaplConfig(kviTestMaplList({"KviTestMaplGoodA", "KviTestMaplSlow"}),
                                          "KviNvStorageDir = \"" + dir.file("nv") + "\"\n"));
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, config.c_str()), SA_OK);
        ASSERT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
        initialize();
    }

    static void initialize()
    {
        SaHpiVersionT version = 0;
        ASSERT_EQ(saHpiInitialize(&version), SA_OK);
    }

    static SaHpiSessionIdT openSession()
    {
        SaHpiSessionIdT session = 0;
        EXPECT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr), SA_OK);
        return session;
    }

    static inline KviLogCapture *log = nullptr;
};

TEST_F(ApiGateTest, ManyClientsPassTheGateTogether)
{
    std::vector<std::thread> clients;
    std::vector<int> failures(8, 0);
    for (int &failed : failures)
        clients.emplace_back([&failed] {
            for (int i = 0; i < 20; i++) {
                SaHpiSessionIdT session = 0;
                failed += saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr) != SA_OK;
                failed += saHpiResourcesDiscover(session) != SA_OK;
                failed += saHpiSessionClose(session) != SA_OK;
            }
        });
    for (std::thread &client : clients)
        client.join();
    for (int failed : failures)
        EXPECT_EQ(failed, 0);
}

TEST_F(ApiGateTest, CallArrivingWhileFinalizeWaitsForAPluginGetsNoResponse)
{
    const SaHpiSessionIdT session = openSession();
    ASSERT_EQ(saHpiResourcesDiscover(session), SA_OK);
    const std::string slow = kviTestMaplPath("KviTestMaplSlow");
    const SaHpiResourceIdT rid = KviLoadedMapl(slow).resource();
    ASSERT_NE(rid, 0u);

    SaErrorT callResult = SA_ERR_HPI_ERROR;
    std::thread call([&] { callResult = kviTestCallIntoPlugin(rid); });
    ASSERT_TRUE(kviTestWaitFor([&] { return KviLoadedMapl(slow).slowCallsRunning() == 1; }));
    log->clear();
    SaErrorT finalized = SA_ERR_HPI_ERROR;
    std::thread finalize([&] { finalized = saHpiFinalize(); });
    // Finalize holds the gate from here until the plug-in call returns.
    ASSERT_TRUE(kviTestWaitFor([] { return log->contains("kviDsMaplManagerUnloadMapl()"); }));

    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(saHpiSessionClose(session), SA_ERR_HPI_NO_RESPONSE);
    const auto waited = std::chrono::steady_clock::now() - start;
    EXPECT_GE(waited, std::chrono::milliseconds(450));
    EXPECT_LT(waited, std::chrono::seconds(5));
    EXPECT_TRUE(kviTestLoggedAt(*log, KVI_LOG_WARN_NUM, "Timeout waiting for isInitialized."));

    KviLoadedMapl(slow).releaseSlowCalls();
    call.join();
    finalize.join();
    EXPECT_EQ(callResult, SA_OK);
    EXPECT_EQ(finalized, SA_OK);
    EXPECT_EQ(saHpiSessionClose(session), SA_ERR_HPI_UNINITIALIZED);
    initialize();
}

} // namespace
