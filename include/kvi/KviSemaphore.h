/* Counting semaphore with millisecond timeouts; the library's only blocking
 * primitive. The caller owns the storage; nothing here allocates. */
#ifndef KVI_SEMAPHORE_H
#define KVI_SEMAPHORE_H

#include <pthread.h>
#include <stdlib.h>
#include <time.h>

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviLogging.h"

KVI_EXTERN_C_BEGIN

/* The library is built with a 64-bit time_t on every target, and its callers
 * must agree, or the struct timespec below has another layout on 32-bit x86:
 * there build with -D_FILE_OFFSET_BITS=64 -D_TIME_BITS=64 (pkg-config and the
 * CMake package add them). */
#ifdef __cplusplus
static_assert(sizeof(time_t) == 8, "KviDaemonCore needs a 64-bit time_t: define _TIME_BITS=64");
#else
_Static_assert(sizeof(time_t) == 8, "KviDaemonCore needs a 64-bit time_t: define _TIME_BITS=64");
#endif

#define KVI_MAX_INT32 0x7FFFFFFF
#define KVI_MAX_UINT32 0xFFFFFFFFu

typedef struct _KviCsSemaphore {
    pthread_mutex_t Mutex;
    pthread_cond_t CondVar;
    SaHpiInt32T Value;
} KviCsSemaphore;

KVI_API SaErrorT kviCsSemInit(const char *FileName, const char *FuncName, SaHpiUint32T LineNum,
                              KviCsSemaphore *Sem, SaHpiUint32T InitialValue) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemDestroy(const char *FileName, const char *FuncName,
                                 SaHpiUint32T LineNum, KviCsSemaphore *Sem) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemPost(const char *FileName, const char *FuncName, SaHpiUint32T LineNum,
                              KviCsSemaphore *Sem) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemWait(const char *FileName, const char *FuncName, SaHpiUint32T LineNum,
                              KviCsSemaphore *Sem, SaHpiUint32T Timeout) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemTryWait(const char *FileName, const char *FuncName,
                                 SaHpiUint32T LineNum, KviCsSemaphore *Sem) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsSemInitNoLogging(KviCsSemaphore *Sem, SaHpiUint32T InitialValue) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemDestroyNoLogging(KviCsSemaphore *Sem) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemPostNoLogging(KviCsSemaphore *Sem) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemWaitNoLogging(KviCsSemaphore *Sem, SaHpiUint32T Timeout) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSemTryWaitNoLogging(KviCsSemaphore *Sem) KVI_NOEXCEPT;

/* Deadlines are on CLOCK_MONOTONIC, so they hold when the wall clock is set
 * and past January 2038: wait on one from kviCsConvertTimeoutToTimespec with
 * kviCsSemWaitTime, or with a condition variable set to that clock. */
KVI_API SaErrorT kviCsSemWaitTime(KviCsSemaphore *Sem, const struct timespec *Timeout) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConvertTimeoutToTimespec(SaHpiUint32T Timeout,
                                               struct timespec *Timespec) KVI_NOEXCEPT;

#define KVI_CS_SEM_INIT(Sem, InitialVal)                                                          \
    kviCsSemInit(__FILE__, __func__, __LINE__, (Sem), (InitialVal))
#define KVI_CS_SEM_DESTROY(Sem) kviCsSemDestroy(__FILE__, __func__, __LINE__, (Sem))
#define KVI_CS_SEM_POST(Sem) kviCsSemPost(__FILE__, __func__, __LINE__, (Sem))
#define KVI_CS_SEM_WAIT(Sem, Timeout) kviCsSemWait(__FILE__, __func__, __LINE__, (Sem), (Timeout))
#define KVI_CS_SEM_TRYWAIT(Sem) kviCsSemTryWait(__FILE__, __func__, __LINE__, (Sem))

#define KVI_CS_SEM_NL_INIT(Sem, InitialVal) kviCsSemInitNoLogging((Sem), (InitialVal))
#define KVI_CS_SEM_NL_DESTROY(Sem) kviCsSemDestroyNoLogging(Sem)
#define KVI_CS_SEM_NL_POST(Sem) kviCsSemPostNoLogging(Sem)
#define KVI_CS_SEM_NL_WAIT(Sem, Timeout) kviCsSemWaitNoLogging((Sem), (Timeout))
#define KVI_CS_SEM_NL_TRYWAIT(Sem) kviCsSemTryWaitNoLogging(Sem)

/* A post that must not fail: a failure means the lock state is lost, so the
 * process ends rather than run on with a wedged semaphore. */
#define KVI_CS_DOA_SEM_POST(Sem)                                                                  \
    do {                                                                                          \
        SaErrorT kviDoaRc_ = KVI_CS_SEM_POST(Sem);                                                \
        if (kviDoaRc_ != SA_OK) {                                                                 \
            KVI_ELOG(KVI_LOG_ERR_FATAL, "kviCsSemPost on " #Sem " returned %d", kviDoaRc_);       \
            exit(1);                                                                              \
        }                                                                                         \
    } while (0)

KVI_EXTERN_C_END

#endif
