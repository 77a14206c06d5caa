#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include "core/utils/KviTrace.h"
#include "support/KviTestSupport.h"

namespace
{
TEST(KviSemaphoreConcurrency, PostFromAnotherThreadWakesAWaiter)
{
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 0), SA_OK);
    std::thread poster([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(100));
        EXPECT_EQ(KVI_CS_SEM_POST(&sem), SA_OK);
    });
    auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(KVI_CS_SEM_WAIT(&sem, 1500), SA_OK);
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(1400));
    poster.join();
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);
}

TEST(KviSemaphoreConcurrency, GuardKeepsACounterConsistent)
{
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 1), SA_OK);
    long counter = 0;
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([&] {
            for (int i = 0; i < 500; ++i) {
                KVI_SEM_GUARD(guard, &sem, 5000);
                ASSERT_TRUE(guard.held());
                ++counter;
            }
        });
    for (auto &t : threads)
        t.join();
    EXPECT_EQ(counter, 2000);
    EXPECT_EQ(sem.Value, 1);
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);
}

TEST(KviSemaphoreConcurrency, LoggingFromManyThreadsKeepsLinesWhole)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t)
        threads.emplace_back([t] {
            for (int i = 0; i < 200; ++i)
                KVI_ILOG(KVI_LOG_INFO, "writer %d line %d end", t, i);
        });
    for (auto &t : threads)
        t.join();
    auto lines = log.matching("writer ");
    EXPECT_EQ(lines.size(), 800u);
    for (auto &l : lines)
        ASSERT_EQ(l.substr(l.size() - 4), " end") << l;
}
} // namespace
