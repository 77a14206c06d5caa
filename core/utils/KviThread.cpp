// Thread operations with the library's result codes and log lines.
#include "kvi/KviThread.h"

#include <cerrno>
#include <cstdint>

#include "core/utils/KviTrace.h"

extern "C" {

KVI_EXPORT SaErrorT kviCsCreateThread(KviCsThreadId *ThreadId, KviCsThreadFuncT func,
                                      void *Arguments) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ThreadId);
    KVI_NULL_CHECK(func);
    KVI_DLOG(KVI_LOG_DBG_L, "About to call pthread_create... ThreadId(%p), func(%p), Arg(%p)",
             static_cast<void *>(ThreadId), reinterpret_cast<void *>(func), Arguments);
    int rc = pthread_create(ThreadId, nullptr, func, Arguments);
    KVI_DLOG(KVI_LOG_DBG_L, "pthread_create returned %d", rc);
    if (rc != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Thread creation failed with error: %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsJoinThread(KviCsThreadId *ThreadId, void **ThreadRet) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ThreadId);
    int rc = pthread_join(*ThreadId, ThreadRet);
    if (rc != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Thread join failed with error: %d", rc);
        return rc == ESRCH ? SA_ERR_HPI_NOT_PRESENT : SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsDetachThread(KviCsThreadId *ThreadId) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ThreadId);
    int rc = pthread_detach(*ThreadId);
    if (rc != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Thread detach failed with error: %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT void kviCsThreadExit(void *ThreadRet) noexcept
{
    KVI_FLOG(KVI_LOG_FUNC_IN, "%s", "");
    KVI_ILOG(KVI_LOG_INFO, "Terminating Current Thread, no more log messages from it.");
    KVI_FLOG(KVI_LOG_FUNC_OUT, "%s", "");
    pthread_exit(ThreadRet);
}

// Called for every log line, so it must not log.
KVI_EXPORT SaErrorT kviCsThreadNum(SaHpiUint32T *ThreadNum) noexcept
{
    if (ThreadNum == nullptr)
        return SA_ERR_HPI_INVALID_PARAMS;
    *ThreadNum = static_cast<SaHpiUint32T>(reinterpret_cast<uintptr_t>(
        reinterpret_cast<void *>(pthread_self())));
    return SA_OK;
}

} // extern "C"
