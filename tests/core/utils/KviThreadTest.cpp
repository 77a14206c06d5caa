#include <gtest/gtest.h>

#include <cstdint>

#include "support/KviTestSupport.h"

namespace
{
void *returnArgument(void *arg) { return arg; }

void *waitThenReturn(void *arg)
{
    KVI_CS_SEM_WAIT(static_cast<KviCsSemaphore *>(arg), 5000);
    return nullptr;
}

void *exitThroughLibrary(void *arg)
{
    kviCsThreadExit(arg);
}

TEST(KviThread, JoinHandsBackTheThreadsResult)
{
    int token = 0;
    KviCsThreadId id;
    ASSERT_EQ(kviCsCreateThread(&id, returnArgument, &token), SA_OK);
    void *result = nullptr;
    ASSERT_EQ(kviCsJoinThread(&id, &result), SA_OK);
    EXPECT_EQ(result, &token);

    KviLogCapture log(KVI_LOG_INFO_NUM);
    ASSERT_EQ(kviCsCreateThread(&id, exitThroughLibrary, &token), SA_OK);
    ASSERT_EQ(kviCsJoinThread(&id, &result), SA_OK);
    EXPECT_EQ(result, &token);
    EXPECT_TRUE(log.contains("Terminating Current Thread, no more log messages from it."));
}

TEST(KviThread, JoiningADetachedOrOwnThreadFails)
{
    KviLogCapture log;
    // Static: the detached thread may still be leaving the wait when the
    // test returns.
    static KviCsSemaphore hold;
    ASSERT_EQ(KVI_CS_SEM_INIT(&hold, 0), SA_OK);
    KviCsThreadId id;
    ASSERT_EQ(kviCsCreateThread(&id, waitThenReturn, &hold), SA_OK);
    ASSERT_EQ(kviCsDetachThread(&id), SA_OK);
    EXPECT_EQ(kviCsJoinThread(&id, nullptr), SA_ERR_HPI_ERROR); // EINVAL: not joinable
    EXPECT_TRUE(log.contains("Thread join failed with error: "));
    ASSERT_EQ(KVI_CS_SEM_POST(&hold), SA_OK);

    KviCsThreadId self = pthread_self();
    EXPECT_EQ(kviCsJoinThread(&self, nullptr), SA_ERR_HPI_ERROR); // EDEADLK
}

TEST(KviThread, NullArgumentsAreRefused)
{
    KviLogCapture log;
    KviCsThreadId id;
    EXPECT_EQ(kviCsCreateThread(nullptr, returnArgument, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsCreateThread(&id, nullptr, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsJoinThread(nullptr, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsDetachThread(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsThreadNum(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("ThreadId pointer is NULL."));
    EXPECT_TRUE(log.contains("func pointer is NULL."));

    SaHpiUint32T num = 0;
    ASSERT_EQ(kviCsThreadNum(&num), SA_OK);
    EXPECT_EQ(num, static_cast<SaHpiUint32T>(reinterpret_cast<uintptr_t>(
                       reinterpret_cast<void *>(pthread_self()))));
}
} // namespace
