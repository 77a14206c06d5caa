#include <atomic>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "core/SaHpi/events/EventManager.h"
#include "core/SaHpi/session/Session.h"
#include "support/KviTestSupport.h"

namespace
{

// Ten subscribers block for events while four plug-in threads post. The
// ring holds every event posted, so no reader may lose one: each sees every
// event exactly once, in number order, and each writer's events in the order
// it posted them.
TEST(EventManagerConcurrencyTest, TenSubscribersSeeEveryEventOnceAndInOrder)
{
    constexpr int writers = 4, perWriter = 200, readers = 10;
    KviTempDir dir;
    ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE,
                              dir.write("eq.conf", "KviEventQueueSize = \"1000\"\n").c_str()),
              SA_OK);
    ASSERT_EQ(kviCsSessionInitialize(), SA_OK);
    ASSERT_EQ(kviCsEventQueueInitialize(), SA_OK);
    std::vector<SaHpiSessionIdT> sessions(readers);
    for (SaHpiSessionIdT &s : sessions) {
        SaHpiUint32T at = 0;
        ASSERT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &s), SA_OK);
        ASSERT_EQ(kviCsSubscribe(s, SAHPI_FALSE, &at), SA_OK);
    }
    std::atomic<int> faults{0};
    std::vector<std::thread> threads;
    for (int r = 0; r < readers; r++) {
        threads.emplace_back([&, r] {
            SaHpiUint32T expected = 2;
            SaHpiTimeT lastOf[writers] = {-1, -1, -1, -1};
            for (int i = 0; i < writers * perWriter; i++, expected++) {
                SaHpiEventT e{};
                SaHpiUint32T n = 0;
                // Generous: a stuck reader fails instead of hanging the run.
                SaErrorT rc = kviCsGetEvent(sessions[r], 30000000000LL, &e, &n);
                const int w = static_cast<int>(e.Source);
                faults += rc != SA_OK || n != expected || w >= writers || e.Timestamp <= lastOf[w];
                if (rc != SA_OK || w >= writers)
                    return;
                lastOf[w] = e.Timestamp;
            }
        });
    }
    for (int w = 0; w < writers; w++) {
        threads.emplace_back([&, w] {
            for (int i = 0; i < perWriter; i++) {
                SaHpiEventT e{};
                e.Source = static_cast<SaHpiResourceIdT>(w);
                e.Timestamp = i;
                faults += kviCsPutEvent(0, &e, 1, SAHPI_FALSE, 0, nullptr) != SA_OK;
            }
        });
    }
    for (std::thread &t : threads)
        t.join();
    EXPECT_EQ(faults, 0);
    kviCsCloseAllSessions();
    EXPECT_EQ(kviCsEventQueueFinalize(), SA_OK);
    kviCsConfigFinalize();
}

} // namespace
