// Costs of the primitives every call of the library pays: a log line that the
// level drops, a written log line, and a semaphore wait+post, each beside the
// raw POSIX primitive as the floor.
#include <benchmark/benchmark.h>

#include <pthread.h>
#include <semaphore.h>

#include "support/KviTestSupport.h"

namespace
{
// Logging opened once for the whole program at the daemon's usual level.
struct LogSession {
    KviTempDir dir;
    LogSession() { kviCsLogInitialize(KVI_LOG_INFO_NUM, dir.file("bench.log").c_str()); }
    ~LogSession() { kviCsLogClose(); }
};
LogSession &logSession()
{
    static LogSession session;
    return session;
}

void BM_LogFilteredOut(benchmark::State &state)
{
    logSession();
    for (auto _ : state)
        benchmark::DoNotOptimize(KVI_DLOG(KVI_LOG_DBG_L, "dropped %d", 42));
}
BENCHMARK(BM_LogFilteredOut);

void BM_LogFunctionTraceFilteredOut(benchmark::State &state)
{
    logSession();
    for (auto _ : state)
        benchmark::DoNotOptimize(KVI_FLOG(KVI_LOG_FUNC_IN, ""));
}
BENCHMARK(BM_LogFunctionTraceFilteredOut);

void BM_LogWritten(benchmark::State &state)
{
    logSession();
    for (auto _ : state)
        benchmark::DoNotOptimize(KVI_ILOG(KVI_LOG_INFO, "written line %d of the benchmark", 42));
}
BENCHMARK(BM_LogWritten);

void BM_RawFprintfFlush(benchmark::State &state)
{
    KviTempDir dir;
    FILE *f = fopen(dir.file("raw.log").c_str(), "a");
    for (auto _ : state) {
        fprintf(f, "written line %d of the benchmark\n", 42);
        fflush(f);
    }
    fclose(f);
}
BENCHMARK(BM_RawFprintfFlush);

void BM_SemWaitPost(benchmark::State &state)
{
    logSession();
    KviCsSemaphore sem;
    KVI_CS_SEM_INIT(&sem, 1);
    for (auto _ : state) {
        KVI_CS_SEM_WAIT(&sem, 1000);
        KVI_CS_SEM_POST(&sem);
    }
    KVI_CS_SEM_DESTROY(&sem);
}
BENCHMARK(BM_SemWaitPost);

void BM_SemWaitPostNoLogging(benchmark::State &state)
{
    KviCsSemaphore sem;
    KVI_CS_SEM_NL_INIT(&sem, 1);
    for (auto _ : state) {
        KVI_CS_SEM_NL_WAIT(&sem, 1000);
        KVI_CS_SEM_NL_POST(&sem);
    }
    KVI_CS_SEM_NL_DESTROY(&sem);
}
BENCHMARK(BM_SemWaitPostNoLogging);

void BM_PosixSemTimedWaitPost(benchmark::State &state)
{
    sem_t sem;
    sem_init(&sem, 0, 1);
    for (auto _ : state) {
        struct timespec deadline;
        clock_gettime(CLOCK_REALTIME, &deadline);
        deadline.tv_sec += 1;
        sem_timedwait(&sem, &deadline);
        sem_post(&sem);
    }
    sem_destroy(&sem);
}
BENCHMARK(BM_PosixSemTimedWaitPost);

void BM_PosixMutexLockUnlock(benchmark::State &state)
{
    pthread_mutex_t m = PTHREAD_MUTEX_INITIALIZER;
    for (auto _ : state) {
        pthread_mutex_lock(&m);
        pthread_mutex_unlock(&m);
    }
}
BENCHMARK(BM_PosixMutexLockUnlock);
} // namespace
