// The reader/writer lock across threads: writer preference, one deadline per
// acquisition, and mutual exclusion under load. Kept small and bounded so that
// it runs under ThreadSanitizer in a few seconds.
#include <atomic>
#include <chrono>
#include <thread>

#include <gtest/gtest.h>

#include "KviDaemonCore.h"

namespace
{
using namespace std::chrono_literals;

class KviRwLockConcurrencyTest : public testing::Test
{
  protected:
    void SetUp() override { ASSERT_EQ(KVI_CS_RW_LOCK_INIT(&lock), SA_OK); }
    void TearDown() override { EXPECT_EQ(KVI_CS_RW_LOCK_DESTROY(&lock), SA_OK); }

    // Returns once a writer has shut the readers' gate, which a try-read
    // reports as an error; a try-read that still gets in is given back.
    bool waitForWaitingWriter()
    {
        for (int i = 0; i < 2000; ++i) {
            SaErrorT rc = KVI_CS_RW_LOCK_TRY_RD_LOCK(&lock);
            if (rc == SA_ERR_HPI_ERROR)
                return true;
            if (rc == SA_OK) {
                EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
            }
            std::this_thread::sleep_for(1ms);
        }
        return false;
    }

    KviCsRwLockT lock{};
};

double msSince(std::chrono::steady_clock::time_point start)
{
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start)
        .count();
}

TEST_F(KviRwLockConcurrencyTest, WriterTimesOutBehindReadersAndHoldsLaterReadersUntilThen)
{
    auto reader = [this] { EXPECT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 1000), SA_OK); };
    std::thread(reader).join();
    std::thread(reader).join();

    SaErrorT writerRc = SA_OK, lateRc = SA_ERR_HPI_ERROR;
    double writerMs = 0, lateMs = 0;
    std::thread writer([&] {
        auto start = std::chrono::steady_clock::now();
        writerRc = KVI_CS_RW_LOCK_WR_LOCK(&lock, 200);
        writerMs = msSince(start);
    });
    EXPECT_TRUE(waitForWaitingWriter());
    std::thread late([&] {
        auto start = std::chrono::steady_clock::now();
        lateRc = KVI_CS_RW_LOCK_RD_LOCK(&lock, 5000);
        lateMs = msSince(start);
    });
    writer.join();
    late.join();

    EXPECT_EQ(writerRc, SA_ERR_HPI_TIMEOUT);
    EXPECT_GE(writerMs, 180);
    EXPECT_LT(writerMs, 2000);
    EXPECT_EQ(lateRc, SA_OK);
    EXPECT_GE(lateMs, 100); // held at the gate until the writer gave up
    for (int i = 0; i < 3; ++i)
        EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    // The timed-out writer left nothing behind.
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_WR_LOCK(&lock), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
}

TEST_F(KviRwLockConcurrencyTest, ReadersArrivingAfterAWaitingWriterGoAfterIt)
{
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    std::atomic<int> turn{0}, writerTurn{-1}, readerTurn{-1};
    std::thread writer([&] {
        EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 5000), SA_OK);
        writerTurn = turn++;
        EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
    });
    EXPECT_TRUE(waitForWaitingWriter());
    std::thread reader([&] {
        EXPECT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 5000), SA_OK);
        readerTurn = turn++;
        EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    });
    // Only readers hold the lock, yet the new reader stays out.
    std::this_thread::sleep_for(50ms);
    EXPECT_EQ(readerTurn, -1);
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    writer.join();
    reader.join();
    EXPECT_EQ(writerTurn, 0);
    EXPECT_EQ(readerTurn, 1);
}

TEST_F(KviRwLockConcurrencyTest, WritersExcludeEveryoneUnderLoad)
{
    constexpr int kRounds = 200;
    // Plain integers: ThreadSanitizer reports any access the lock fails to order.
    int first = 0, second = 0;
    auto writer = [&] {
        for (int i = 0; i < kRounds; ++i) {
            ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 5000), SA_OK);
            int seen = first; // a second writer inside would lose an update here
            std::this_thread::yield();
            first = seen + 1;
            second = seen + 1;
            EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
        }
    };
    auto reader = [&](bool tryOnly) {
        for (int i = 0; i < kRounds; ++i) {
            SaErrorT rc =
                tryOnly ? KVI_CS_RW_LOCK_TRY_RD_LOCK(&lock) : KVI_CS_RW_LOCK_RD_LOCK(&lock, 5000);
            if (tryOnly && rc != SA_OK)
                continue;
            ASSERT_EQ(rc, SA_OK);
            EXPECT_EQ(first, second);
            EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
        }
    };
    std::thread threads[] = {std::thread(writer), std::thread(writer), std::thread(reader, false),
                             std::thread(reader, true)};
    for (std::thread &t : threads)
        t.join();
    EXPECT_EQ(first, 2 * kRounds);
    EXPECT_EQ(lock.NumReaders + lock.NumWriters, 0u);
    for (const KviCsSemaphore *s :
         {&lock.WriteMutex, &lock.ReadMutex, &lock.Access, &lock.Read, &lock.ReadWrite})
        EXPECT_EQ(s->Value, 1);
}
} // namespace

namespace
{
// A plug-in being unloaded takes each of its locks for writing and then
// destroys and frees it, while the last reader may still be leaving. The
// reader must not touch the lock once the writer can have it.
TEST(KviRwLockLifetime, WriterMayFreeTheLockAsSoonAsItHasIt)
{
    for (int round = 0; round < 50; ++round) {
        auto *lock = new KviCsRwLockT{};
        ASSERT_EQ(KVI_CS_RW_LOCK_INIT(lock), SA_OK);
        ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(lock, 1000), SA_OK);
        std::thread writer([lock] {
            ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(lock, 5000), SA_OK);
            ASSERT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(lock), SA_OK);
            ASSERT_EQ(KVI_CS_RW_LOCK_DESTROY(lock), SA_OK);
            delete lock;
        });
        std::this_thread::sleep_for(std::chrono::microseconds(200 + 37 * round));
        ASSERT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(lock), SA_OK);
        writer.join();
    }
}
} // namespace
