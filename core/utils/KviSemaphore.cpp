// Counting semaphore: a mutex, a condition variable and a signed count, with
// every wait bounded by a deadline. The workers take a UseLogging switch so
// that the logger itself can use the same code without recursing into itself;
// fatal lines are written whatever the switch says.
#include "kvi/KviSemaphore.h"

#include <cerrno>
#include <cstdint>

#include "core/utils/KviClock.h"
#include "core/utils/KviTrace.h"

namespace
{
constexpr long long NANOS_PER_SECOND = 1000000000LL;

SaHpiUint32T addressOf(const void *p)
{
    return static_cast<SaHpiUint32T>(reinterpret_cast<uintptr_t>(p));
}

// Logs only when the caller's form logs.
struct SemLog {
    bool on;
    template <class... Args>
    void operator()(const char *file, int line, const char *func, SaHpiUint32T level,
                    const char *format, Args... args) const
    {
        if (!on || !kviCsLogWanted(level))
            return;
        if constexpr (sizeof...(Args) == 0)
            kviCsLogger(file, static_cast<SaHpiInt16T>(line), func, level, "%s", format);
        else
            kviCsLogger(file, static_cast<SaHpiInt16T>(line), func, level, format, args...);
    }
};

#define SEM_NULL_CHECK(LoggingUse, MySem)                                                          \
    do {                                                                                           \
        if ((MySem) == nullptr) {                                                                  \
            LoggingUse(KVI_LOG_ERR_NONFATAL, "Null passed in for Sem");                            \
            LoggingUse(KVI_LOG_FUNC_OUT, "Error");                                                 \
            return SA_ERR_HPI_INVALID_PARAMS;                                                      \
        }                                                                                          \
    } while (0)

[[noreturn]] void fatal(const char *file, int line, const char *func, const char *message)
{
    kviCsLogger(file, static_cast<SaHpiInt16T>(line), func, KVI_LOG_ERR_FATAL_NUM, "%s", message);
    kviCsLogger(file, static_cast<SaHpiInt16T>(line), func, KVI_LOG_FUNC_OUT_NUM, "Error");
    exit(1);
}
#define SEM_FATAL(message) fatal(__FILE__, __LINE__, __func__, message)

void unlockOrDie(KviCsSemaphore *Sem)
{
    if (pthread_mutex_unlock(&Sem->Mutex) != 0)
        SEM_FATAL("pthread_mutex_unlock failed.");
}

// Absolute deadline Timeout milliseconds from now, in seconds and
// microseconds of the monotonic clock that the condition variables wait on:
// the wall clock's seconds would trip the range guard from late 2037 on, and
// setting the wall clock would stretch or cut every wait. The sum of exactly
// one second of nanoseconds is left unnormalised, and the range guard divides
// the current seconds by 1000: both are kept as they have always behaved.
SaErrorT deadlineFromNow(const SemLog &log, SaHpiUint32T Timeout, struct timespec *deadline)
{
    struct timespec now;
    if (kviCsClockRead(CLOCK_MONOTONIC, &now) != 0) {
        log(KVI_LOG_ERR_NONFATAL, "gettimeofday failed");
        return SA_ERR_HPI_ERROR;
    }
    long long nanos = static_cast<long long>(Timeout % 1000) * 1000000LL +
                      static_cast<long long>(now.tv_nsec / 1000) * 1000LL;
    long long seconds = now.tv_sec;
    if (nanos > NANOS_PER_SECOND) {
        nanos -= NANOS_PER_SECOND;
        seconds += 1;
    }
    if (seconds >= KVI_MAX_INT32 - seconds / 1000) {
        log(KVI_LOG_ERR_NONFATAL, "Can't honor requested timeout!");
        return SA_ERR_HPI_ERROR;
    }
    deadline->tv_sec = static_cast<time_t>(seconds + Timeout / 1000);
    deadline->tv_nsec = static_cast<long>(nanos);
    return SA_OK;
}

// Steps shared by the timed waits once the mutex is held: sleep until the
// count is positive or the deadline passes, then take one.
SaErrorT takeBeforeDeadline(const SemLog &log, KviCsSemaphore *Sem, const struct timespec *deadline,
                            const char *successText)
{
    log(KVI_LOG_DBG_L, "Sem->Value=%d", Sem->Value);
    while (Sem->Value < 1) {
        int rc = pthread_cond_timedwait(&Sem->CondVar, &Sem->Mutex, deadline);
        if (rc == ETIMEDOUT) {
            log(KVI_LOG_SEM, "Semaphore timed out");
            unlockOrDie(Sem);
            log(KVI_LOG_FUNC_OUT, "Timed out");
            return SA_ERR_HPI_TIMEOUT;
        }
        if (rc != 0 && rc != EINTR) {
            log(KVI_LOG_SEM, "Unkonwn Error");
            unlockOrDie(Sem);
            log(KVI_LOG_FUNC_OUT, "Error");
            return SA_ERR_HPI_ERROR;
        }
    }
    Sem->Value--;
    unlockOrDie(Sem);
    log(KVI_LOG_SEM, successText, Sem);
    return SA_OK;
}

// The condition variable measures deadlines on the clock deadlineFromNow
// reads.
int initMonotonicCondition(pthread_cond_t *CondVar)
{
    pthread_condattr_t attributes;
    int rc = pthread_condattr_init(&attributes);
    if (rc != 0)
        return rc;
    rc = pthread_condattr_setclock(&attributes, CLOCK_MONOTONIC);
    if (rc == 0)
        rc = pthread_cond_init(CondVar, &attributes);
    pthread_condattr_destroy(&attributes);
    return rc;
}

SaErrorT lockMutex(const SemLog &log, KviCsSemaphore *Sem)
{
    if (pthread_mutex_lock(&Sem->Mutex) != 0) {
        log(KVI_LOG_ERR_NONFATAL, "pthread_mutex_lock failed.");
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

SaErrorT kviCsSemInitBase(SaHpiBoolT UseLogging, KviCsSemaphore *Sem, SaHpiUint32T InitialValue)
{
    SemLog log{UseLogging != SAHPI_FALSE};
    SEM_NULL_CHECK(log, Sem);
    if (InitialValue > static_cast<SaHpiUint32T>(KVI_MAX_INT32)) {
        log(KVI_LOG_ERR_NONFATAL, "InitialValue > KVI_MAX_INT32");
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    Sem->Value = static_cast<SaHpiInt32T>(InitialValue);
    int rc = initMonotonicCondition(&Sem->CondVar);
    if (rc != 0) {
        log(KVI_LOG_ERR_NONFATAL, "pthread_cond_init failed. rc=%d", rc);
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    rc = pthread_mutex_init(&Sem->Mutex, nullptr);
    if (rc != 0) {
        log(KVI_LOG_ERR_NONFATAL, "pthread_mutex_init failed. rc=%d", rc);
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    log(KVI_LOG_SEM, "Allocated Semaphore %#8.8x Value: %d", addressOf(Sem), Sem->Value);
    return SA_OK;
}

SaErrorT kviCsSemDestroyBase(SaHpiBoolT UseLogging, KviCsSemaphore *Sem)
{
    SemLog log{UseLogging != SAHPI_FALSE};
    SEM_NULL_CHECK(log, Sem);
    Sem->Value = 0;
    int rc = pthread_cond_destroy(&Sem->CondVar);
    if (rc != 0) {
        log(KVI_LOG_ERR_NONFATAL, "pthread_cond_destroy failed. rc=%d", rc);
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    rc = pthread_mutex_destroy(&Sem->Mutex);
    if (rc != 0) {
        log(KVI_LOG_ERR_NONFATAL, "pthread_mutex_destroy failed. rc=%d", rc);
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    log(KVI_LOG_SEM, "Destroyed Semaphore %#8.8x", addressOf(Sem));
    return SA_OK;
}

SaErrorT kviCsSemPostBase(SaHpiBoolT UseLogging, KviCsSemaphore *Sem)
{
    SemLog log{UseLogging != SAHPI_FALSE};
    SEM_NULL_CHECK(log, Sem);
    if (lockMutex(log, Sem) != SA_OK)
        return SA_ERR_HPI_ERROR;
    if (Sem->Value == KVI_MAX_INT32) {
        // The quiet form leaves the mutex locked here: the semaphore is
        // unusable from then on. Kept as it has always behaved.
        if (!log.on)
            return SA_ERR_HPI_ERROR;
        log(KVI_LOG_ERR_NONFATAL, "Values would wrap. Value is %d", Sem->Value);
        unlockOrDie(Sem);
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    Sem->Value++;
    int rc = pthread_cond_signal(&Sem->CondVar);
    if (rc != 0)
        log(KVI_LOG_ERR_NONFATAL, "pthread_cond_signal returned %d", rc);
    unlockOrDie(Sem);
    log(KVI_LOG_SEM, "Post to Semaphore %#8.8x", addressOf(Sem));
    return SA_OK;
}

SaErrorT kviCsSemWaitBase(SaHpiBoolT UseLogging, KviCsSemaphore *Sem, SaHpiUint32T Timeout)
{
    SemLog log{UseLogging != SAHPI_FALSE};
    log(KVI_LOG_SEM, "Waiting on Semaphore %#8.8x", addressOf(Sem));
    SEM_NULL_CHECK(log, Sem);
    if (lockMutex(log, Sem) != SA_OK)
        return SA_ERR_HPI_ERROR;
    // Only a wait that has to sleep needs its deadline: a count that is there
    // is taken without reading the clock, which every lock of every call
    // would otherwise pay for.
    struct timespec deadline {};
    if (Sem->Value < 1 && deadlineFromNow(log, Timeout, &deadline) != SA_OK) {
        unlockOrDie(Sem);
        log(KVI_LOG_FUNC_OUT, "Error");
        return SA_ERR_HPI_ERROR;
    }
    return takeBeforeDeadline(log, Sem, &deadline, "SemWait success");
}

SaErrorT kviCsSemTryWaitBase(SaHpiBoolT UseLogging, KviCsSemaphore *Sem)
{
    SemLog log{UseLogging != SAHPI_FALSE};
    log(KVI_LOG_SEM, "Waiting on Semaphore %#8.8x", addressOf(Sem));
    SEM_NULL_CHECK(log, Sem);
    if (lockMutex(log, Sem) != SA_OK)
        return SA_ERR_HPI_ERROR;
    if (Sem->Value < 1) {
        log(KVI_LOG_SEM, "Trywait unsuccessful");
        unlockOrDie(Sem);
        log(KVI_LOG_FUNC_OUT, "TryWait failed");
        return SA_ERR_HPI_BUSY;
    }
    Sem->Value--;
    unlockOrDie(Sem);
    log(KVI_LOG_SEM, "SemTryWait success");
    return SA_OK;
}

// The logged wrappers trace the operation with the caller's position.
struct CallerTrace {
    const char *name;
    const char *file;
    const char *func;
    SaHpiUint32T line;
    const KviCsSemaphore *sem;
    SaErrorT finish(SaErrorT rc) const
    {
        KVI_SLOG(KVI_LOG_SEM, "%s: %#8.8x %s %s %u", name, addressOf(sem), file ? file : "",
                 func ? func : "", line);
        return rc;
    }
};
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsSemInit(const char *FileName, const char *FuncName, SaHpiUint32T LineNum,
                                 KviCsSemaphore *Sem, SaHpiUint32T InitialValue) noexcept
{
    KVI_TRACE("");
    CallerTrace t{"kviCsSemInit", FileName, FuncName, LineNum, Sem};
    return t.finish(kviCsSemInitBase(SAHPI_TRUE, Sem, InitialValue));
}

KVI_EXPORT SaErrorT kviCsSemDestroy(const char *FileName, const char *FuncName,
                                    SaHpiUint32T LineNum, KviCsSemaphore *Sem) noexcept
{
    KVI_TRACE("");
    CallerTrace t{"kviCsSemDestroy", FileName, FuncName, LineNum, Sem};
    return t.finish(kviCsSemDestroyBase(SAHPI_TRUE, Sem));
}

KVI_EXPORT SaErrorT kviCsSemPost(const char *FileName, const char *FuncName, SaHpiUint32T LineNum,
                                 KviCsSemaphore *Sem) noexcept
{
    KVI_TRACE("");
    CallerTrace t{"kviCsSemPost", FileName, FuncName, LineNum, Sem};
    return t.finish(kviCsSemPostBase(SAHPI_TRUE, Sem));
}

KVI_EXPORT SaErrorT kviCsSemWait(const char *FileName, const char *FuncName, SaHpiUint32T LineNum,
                                 KviCsSemaphore *Sem, SaHpiUint32T Timeout) noexcept
{
    KVI_TRACE("");
    CallerTrace t{"kviCsSemWait", FileName, FuncName, LineNum, Sem};
    return t.finish(kviCsSemWaitBase(SAHPI_TRUE, Sem, Timeout));
}

KVI_EXPORT SaErrorT kviCsSemTryWait(const char *FileName, const char *FuncName,
                                    SaHpiUint32T LineNum, KviCsSemaphore *Sem) noexcept
{
    KVI_TRACE("");
    CallerTrace t{"kviCsSemTryWait", FileName, FuncName, LineNum, Sem};
    return t.finish(kviCsSemTryWaitBase(SAHPI_TRUE, Sem));
}

KVI_EXPORT SaErrorT kviCsSemInitNoLogging(KviCsSemaphore *Sem, SaHpiUint32T InitialValue) noexcept
{
    return kviCsSemInitBase(SAHPI_FALSE, Sem, InitialValue);
}

KVI_EXPORT SaErrorT kviCsSemDestroyNoLogging(KviCsSemaphore *Sem) noexcept
{
    return kviCsSemDestroyBase(SAHPI_FALSE, Sem);
}

KVI_EXPORT SaErrorT kviCsSemPostNoLogging(KviCsSemaphore *Sem) noexcept
{
    return kviCsSemPostBase(SAHPI_FALSE, Sem);
}

KVI_EXPORT SaErrorT kviCsSemWaitNoLogging(KviCsSemaphore *Sem, SaHpiUint32T Timeout) noexcept
{
    return kviCsSemWaitBase(SAHPI_FALSE, Sem, Timeout);
}

KVI_EXPORT SaErrorT kviCsSemTryWaitNoLogging(KviCsSemaphore *Sem) noexcept
{
    return kviCsSemTryWaitBase(SAHPI_FALSE, Sem);
}

KVI_EXPORT SaErrorT kviCsSemWaitTime(KviCsSemaphore *Sem, const struct timespec *Timeout) noexcept
{
    KVI_TRACE("");
    SemLog log{true};
    if (Sem == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Null passed in for Sem");
        KVI_SLOG(KVI_LOG_SEM, "Error (NULL) Waiting on Semaphore %#8.8x", addressOf(Sem));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KVI_NULL_CHECK(Timeout);
    if (pthread_mutex_lock(&Sem->Mutex) != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "pthread_mutex_lock failed.");
        KVI_SLOG(KVI_LOG_SEM, "Error locking mutex %#8.8x", addressOf(Sem));
        return SA_ERR_HPI_ERROR;
    }
    return takeBeforeDeadline(log, Sem, Timeout, "Successful SemWaitTime on sem %p");
}

KVI_EXPORT SaErrorT kviCsConvertTimeoutToTimespec(SaHpiUint32T Timeout,
                                                  struct timespec *Timespec) noexcept
{
    KVI_TRACE("Timeout: %d", static_cast<int>(Timeout));
    KVI_NULL_CHECK(Timespec);
    return deadlineFromNow(SemLog{true}, Timeout, Timespec);
}

} // extern "C"
