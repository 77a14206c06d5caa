#include "core/SaHpi/session/Session.h"

#include <algorithm>
#include <array>
#include <atomic>
#include <set>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

namespace
{

std::atomic<int> signalCalls{0};

// Looks into the table the way a woken event reader does; if the closing
// thread still held the semaphore this would time out and fail the close.
SaErrorT tableReadingSignal()
{
    signalCalls++;
    return kviCsSessionValidate(KVI_CS_SESSION_OFFSET) == SA_ERR_HPI_ERROR ? SA_ERR_HPI_ERROR
                                                                           : SA_OK;
}

class SessionConcurrencyTest : public testing::Test
{
  protected:
    void SetUp() override
    {
        ASSERT_EQ(kviCsSessionInitialize(), SA_OK);
        previousHook_ = kviCsSessionSetSignalHook(tableReadingSignal);
        signalCalls = 0;
    }
    void TearDown() override
    {
        kviCsCloseAllSessions();
        kviCsSessionSetSignalHook(previousHook_);
    }
    template <typename Body> static void runThreads(int count, Body body)
    {
        std::vector<std::thread> threads;
        for (int i = 0; i < count; i++)
            threads.emplace_back(body, i);
        for (std::thread &t : threads)
            t.join();
    }
    // Counts results outside the allowed ones.
    void allow(SaErrorT rc, std::initializer_list<SaErrorT> ok)
    {
        unexpected += std::find(ok.begin(), ok.end(), rc) == ok.end();
    }
    std::atomic<int> unexpected{0};

  private:
    KviCsSessionSignalFnT previousHook_ = nullptr;
};

TEST_F(SessionConcurrencyTest, OpenValidateCloseFromManyThreads)
{
    constexpr int threads = 8;
    constexpr int rounds = 150;
    std::array<std::vector<SaHpiSessionIdT>, threads> ids;
    runThreads(threads, [&](int t) {
        const SaHpiInt32T conn = t + 1;
        for (SaHpiUint32T r = 0; r < rounds; r++) {
            SaHpiSessionIdT id = 0;
            SaHpiInt32T seen = 0;
            SaHpiUint32T last = 0;
            SaHpiDomainIdT domain = 1;
            allow(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id), {SA_OK});
            ids[t].push_back(id);
            allow(kviCsSessionValidate(id), {SA_OK});
            allow(kviCsAddConnectionToSession(id, conn), {SA_OK});
            allow(kviCsGetConnectionFromSession(id, &seen), {SA_OK});
            allow(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, r), {SA_OK});
            allow(kviCsSetSessionLastEvent(id, r + 1), {SA_OK});
            allow(kviCsGetSessionLastEvent(id, &last), {SA_OK});
            allow(kviCsGetDomainFromSession(id, &domain), {SA_OK});
            unexpected += seen != conn || last != r + 1 || domain != 0;
            allow(kviCsSessionClose(id), {SA_OK});
            allow(kviCsSessionValidate(id), {SA_ERR_HPI_INVALID_SESSION});
            allow(kviCsSessionClose(id), {SA_ERR_HPI_DUPLICATE});
        }
    });

    EXPECT_EQ(unexpected, 0);
    EXPECT_EQ(signalCalls, threads * rounds);
    std::set<SaHpiSessionIdT> all;
    for (const auto &mine : ids) {
        EXPECT_TRUE(std::is_sorted(mine.begin(), mine.end()));
        all.insert(mine.begin(), mine.end());
    }
    // Every id handed out once, none skipped.
    ASSERT_EQ(all.size(), static_cast<size_t>(threads * rounds));
    EXPECT_EQ(*all.rbegin() - *all.begin(), static_cast<SaHpiSessionIdT>(threads * rounds - 1));
}

TEST_F(SessionConcurrencyTest, RacingForTheLastSlotsFillsTheTableExactly)
{
    constexpr int threads = 10;
    constexpr int attempts = 15;
    std::array<std::vector<SaHpiSessionIdT>, threads> opened;
    std::atomic<int> refused{0};
    runThreads(threads, [&](int t) {
        for (int a = 0; a < attempts; a++) {
            SaHpiSessionIdT id = 0;
            SaErrorT rc = kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id);
            allow(rc, {SA_OK, SA_ERR_HPI_DATA_EX_LIMITS});
            if (rc == SA_OK)
                opened[t].push_back(id);
            refused += rc == SA_ERR_HPI_DATA_EX_LIMITS;
        }
    });

    std::set<SaHpiSessionIdT> all;
    for (const auto &mine : opened)
        all.insert(mine.begin(), mine.end());
    EXPECT_EQ(unexpected, 0);
    EXPECT_EQ(refused, threads * attempts - KVI_CS_MAX_SESSIONS);
    ASSERT_EQ(all.size(), static_cast<size_t>(KVI_CS_MAX_SESSIONS));
    // Refused opens spent no ids.
    EXPECT_EQ(*all.rbegin() - *all.begin(), static_cast<SaHpiSessionIdT>(KVI_CS_MAX_SESSIONS - 1));
    ASSERT_EQ(kviCsSessionClose(*all.begin()), SA_OK);
    SaHpiSessionIdT next = 0;
    EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &next), SA_OK);
    EXPECT_EQ(next, *all.rbegin() + 1);
}

TEST_F(SessionConcurrencyTest, ConnectionsDroppedWhileTheirSessionsAreInUse)
{
    constexpr int workers = 4;
    std::atomic<bool> done{false};
    std::thread closer([&] {
        for (SaHpiInt32T conn = 1; !done; conn = conn % workers + 1)
            allow(kviCsCloseAllSessionsToConnection(conn), {SA_OK});
    });
    runThreads(workers, [&](int t) {
        // The connection can be dropped between any two of these calls.
        const std::initializer_list<SaErrorT> openOrGone = {SA_OK, SA_ERR_HPI_INVALID_SESSION};
        for (int r = 0; r < 200; r++) {
            SaHpiSessionIdT id = 0;
            SaHpiBoolT subscribed = 0;
            allow(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id), {SA_OK});
            allow(kviCsAddConnectionToSession(id, t + 1), openOrGone);
            allow(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 0), openOrGone);
            allow(kviCsSessionValidate(id), openOrGone);
            allow(kviCsGetSessionEventSubscription(id, &subscribed), openOrGone);
            allow(kviCsSessionClose(id), {SA_OK, SA_ERR_HPI_DUPLICATE});
        }
    });
    done = true;
    closer.join();

    EXPECT_EQ(unexpected, 0);
    std::array<KviSessionIdsT, KVI_CS_MAX_SESSIONS> table{};
    ASSERT_EQ(kviCsSessionTableCopy(table.data()), SA_OK);
    for (const KviSessionIdsT &slot : table)
        EXPECT_EQ(slot.InUse, SAHPI_FALSE);
}

} // namespace
