#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>

#include "support/KviTestSupport.h"

namespace
{
using Clock = std::chrono::steady_clock;

long long msSince(Clock::time_point start)
{
    return std::chrono::duration_cast<std::chrono::milliseconds>(Clock::now() - start).count();
}

TEST(KviSemaphore, InitialValueIsBoundedBySignedRange)
{
    KviLogCapture log;
    KviCsSemaphore sem;
    EXPECT_EQ(KVI_CS_SEM_INIT(&sem, 0x80000000u), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("InitialValue > KVI_MAX_INT32"));
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 0x7FFFFFFFu), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_POST(&sem), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Values would wrap. Value is 2147483647"));
    // The logged form gives the mutex back after refusing.
    EXPECT_EQ(KVI_CS_SEM_TRYWAIT(&sem), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);
}

TEST(KviSemaphore, QuietPostAtTheLimitKeepsTheMutexLocked)
{
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_NL_INIT(&sem, 0x7FFFFFFFu), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_NL_POST(&sem), SA_ERR_HPI_ERROR);
    EXPECT_EQ(pthread_mutex_trylock(&sem.Mutex), EBUSY);
    // Leave it as it is: a semaphore in this state is lost for good.
}

TEST(KviSemaphore, WaitWithZeroTimeoutReturnsAtOnce)
{
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 0), SA_OK);
    auto start = Clock::now();
    EXPECT_EQ(KVI_CS_SEM_WAIT(&sem, 0), SA_ERR_HPI_TIMEOUT);
    EXPECT_LT(msSince(start), 200);
    ASSERT_EQ(KVI_CS_SEM_POST(&sem), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_WAIT(&sem, 0), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_NL_WAIT(&sem, 0), SA_ERR_HPI_TIMEOUT);
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);
}

TEST(KviSemaphore, WaitTimesOutAfterItsTimeout)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_SEM_NUM | KVI_LOG_FUNC_OUT_NUM);
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 0), SA_OK);
    auto start = Clock::now();
    EXPECT_EQ(KVI_CS_SEM_WAIT(&sem, 1500), SA_ERR_HPI_TIMEOUT);
    long long waited = msSince(start);
    EXPECT_GE(waited, 1450);
    EXPECT_LT(waited, 3000);
    EXPECT_TRUE(log.contains("Semaphore timed out"));
    EXPECT_TRUE(log.contains("Function exit: Timed out"));
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);
}

TEST(KviSemaphore, TryWaitNeverBlocks)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_SEM_NUM);
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 1), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_TRYWAIT(&sem), SA_OK);
    EXPECT_EQ(KVI_CS_SEM_TRYWAIT(&sem), SA_ERR_HPI_BUSY);
    EXPECT_EQ(KVI_CS_SEM_NL_TRYWAIT(&sem), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(log.contains("Trywait unsuccessful"));
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);
}

TEST(KviSemaphore, NullSemaphoreIsRefusedByEveryOperation)
{
    KviLogCapture log;
    struct timespec deadline {};
    EXPECT_EQ(KVI_CS_SEM_INIT(nullptr, 1), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_DESTROY(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_POST(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_WAIT(nullptr, 10), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_TRYWAIT(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_NL_INIT(nullptr, 1), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_NL_POST(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_NL_WAIT(nullptr, 10), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_NL_TRYWAIT(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(KVI_CS_SEM_NL_DESTROY(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsSemWaitTime(nullptr, &deadline), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsConvertTimeoutToTimespec(10, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(log.matching("Null passed in for Sem").size(), 6u);
    EXPECT_TRUE(log.contains("Timespec pointer is NULL."));
}

TEST(KviSemaphore, SharedDeadlineBoundsSeveralWaits)
{
    KviCsSemaphore a, b;
    ASSERT_EQ(KVI_CS_SEM_INIT(&a, 1), SA_OK);
    ASSERT_EQ(KVI_CS_SEM_INIT(&b, 0), SA_OK);
    struct timespec deadline;
    auto start = Clock::now();
    ASSERT_EQ(kviCsConvertTimeoutToTimespec(300, &deadline), SA_OK);
    EXPECT_EQ(kviCsSemWaitTime(&a, &deadline), SA_OK);
    EXPECT_EQ(kviCsSemWaitTime(&b, &deadline), SA_ERR_HPI_TIMEOUT);
    EXPECT_EQ(kviCsSemWaitTime(&a, &deadline), SA_ERR_HPI_TIMEOUT);
    long long waited = msSince(start);
    EXPECT_GE(waited, 250);
    EXPECT_LT(waited, 1500);
    EXPECT_EQ(deadline.tv_nsec >= 0 && deadline.tv_nsec <= 1000000000L, true);
}

TEST(KviSemaphore, TraceNamesTheCaller)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_SEM_NUM);
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 1), SA_OK);
    int line = __LINE__ + 1;
    ASSERT_EQ(KVI_CS_SEM_POST(&sem), SA_OK);
    char addr[16];
    snprintf(addr, sizeof addr, "%#8.8x", static_cast<unsigned>(reinterpret_cast<uintptr_t>(&sem)));
    std::string expected = std::string("kviCsSemPost: ") + addr + " " + __FILE__ + " " + __func__ +
                           " " + std::to_string(line);
    EXPECT_TRUE(log.contains(expected)) << expected;
    EXPECT_TRUE(log.contains(std::string("Post to Semaphore ") + addr));
}

TEST(KviSemaphoreDeathTest, FailedDoaPostEndsTheProcess)
{
    KviLogCapture log;
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 0x7FFFFFFFu), SA_OK);
    EXPECT_EXIT(KVI_CS_DOA_SEM_POST(&sem), testing::ExitedWithCode(1), "");
    EXPECT_TRUE(log.contains("kviCsSemPost on &sem returned -1001"));
}
} // namespace
