// Threads of one client calling through the client library at once: each
// call finds a connection of its own, a thread waiting for events holds up
// no one, and sessions open and close beside the calls.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "../../plugins/simulator/SimulatorTestSupport.h"
#include "HpidTestSupport.h"
#include "support/KviTestSupport.h"

TEST(HpidConcurrencyTest, ThreadsOfOneClientCallAtOnce)
{
    KviTempDir dir;
    KviHpid daemon(dir.write("hpid.conf", kviHpidShelfConfig(simulatorPath(), dir.file("nv"))),
                   dir.file("hpid.log"));
    ASSERT_NE(daemon.port(), 0);
    void *client = kviHpiClientOpen(daemon.port());
    ASSERT_NE(client, nullptr);
    SaHpiVersionT version;
    SaHpiSessionIdT session;
    ASSERT_EQ(KVI_REMOTE(client, saHpiInitialize)(&version), SA_OK);
    ASSERT_EQ(KVI_REMOTE(client, saHpiSessionOpen)(0, &session, nullptr), SA_OK);
    ASSERT_EQ(KVI_REMOTE(client, saHpiSubscribe)(session, SAHPI_FALSE), SA_OK);

    std::atomic<int> failures{0};
    std::atomic<bool> done{false};
    std::thread waiter([&] {
        SaHpiEventT event;
        while (!done) {
            SaErrorT rc =
                KVI_REMOTE(client, saHpiEventGet)(session, 20000000LL, &event, nullptr, nullptr);
            failures += rc != SA_OK && rc != SA_ERR_HPI_TIMEOUT;
        }
    });
    std::vector<std::thread> callers;
    for (int t = 0; t < 4; ++t) {
        callers.emplace_back([&, t] {
            for (int i = 0; i < 50; ++i) {
                SaHpiSensorReadingT reading;
                SaHpiSessionIdT own;
                SaErrorT rc = KVI_REMOTE(client, saHpiSensorReadingGet)(session, 2, 1, &reading);
                if (rc != SA_OK && failures++ == 0)
                    ADD_FAILURE() << "rc " << rc;
                if (t == 0 && KVI_REMOTE(client, saHpiSessionOpen)(0, &own, nullptr) == SA_OK)
                    failures += KVI_REMOTE(client, saHpiSessionClose)(own) != SA_OK;
            }
        });
    }
    for (auto &c : callers)
        c.join();
    done = true;
    waiter.join();
    EXPECT_EQ(failures, 0);
    EXPECT_EQ(KVI_REMOTE(client, saHpiFinalize)(), SA_OK);
    EXPECT_EQ(daemon.stop(SIGTERM), 0);
}
