// Cost of taking and releasing the reader/writer lock, beside the POSIX
// rwlock as the floor. Every API call takes isInitializedLock and the plug-in
// locks for reading, so the uncontended read path is on every request.
//
// The plain variants run with logging never opened (every log call returns at
// once); the LogOpen variants open the log at the daemon's usual level, where
// the trace lines are filtered but each call still pays the level check.
#include <pthread.h>

#include <benchmark/benchmark.h>

#include "KviDaemonCore.h"

namespace
{
KviCsRwLockT *sharedLock()
{
    static KviCsRwLockT lock;
    static const SaErrorT rc = KVI_CS_RW_LOCK_INIT(&lock);
    return rc == SA_OK ? &lock : nullptr;
}

pthread_rwlock_t posixLock = PTHREAD_RWLOCK_INITIALIZER;

void openLog(const benchmark::State &)
{
    kviCsLogInitialize(KVI_LOG_INFO_NUM, "/dev/null");
}
void closeLog(const benchmark::State &)
{
    kviCsLogClose();
}

void BM_KviRwLockRead(benchmark::State &state)
{
    KviCsRwLockT *lock = sharedLock();
    for (auto _ : state) {
        if (KVI_CS_RW_LOCK_RD_LOCK(lock, 1000) != SA_OK ||
            KVI_CS_RW_LOCK_RD_UNLOCK(lock) != SA_OK) {
            state.SkipWithError("read lock failed");
            break;
        }
    }
}
BENCHMARK(BM_KviRwLockRead);
BENCHMARK(BM_KviRwLockRead)->Threads(2)->UseRealTime();
BENCHMARK(BM_KviRwLockRead)->Name("BM_KviRwLockRead/LogOpen")->Setup(openLog)->Teardown(closeLog);
BENCHMARK(BM_KviRwLockRead)
    ->Name("BM_KviRwLockRead/LogOpen")
    ->Setup(openLog)
    ->Teardown(closeLog)
    ->Threads(2)
    ->UseRealTime();

void BM_KviRwLockWrite(benchmark::State &state)
{
    KviCsRwLockT *lock = sharedLock();
    for (auto _ : state) {
        if (KVI_CS_RW_LOCK_WR_LOCK(lock, 1000) != SA_OK ||
            KVI_CS_RW_LOCK_WR_UNLOCK(lock) != SA_OK) {
            state.SkipWithError("write lock failed");
            break;
        }
    }
}
BENCHMARK(BM_KviRwLockWrite);

void BM_PosixRwLockRead(benchmark::State &state)
{
    for (auto _ : state) {
        pthread_rwlock_rdlock(&posixLock);
        pthread_rwlock_unlock(&posixLock);
    }
}
BENCHMARK(BM_PosixRwLockRead);
BENCHMARK(BM_PosixRwLockRead)->Threads(2)->UseRealTime();
} // namespace
