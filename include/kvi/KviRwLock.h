/* Writer-preference reader/writer lock with bounded waits, built from five
 * counting semaphores. Use it only through the macros below. */
#ifndef KVI_RWLOCK_H
#define KVI_RWLOCK_H

#include "kvi/KviSemaphore.h"

KVI_EXTERN_C_BEGIN

typedef struct _KviCsRwLockT {
    SaHpiUint32T NumWriters;
    SaHpiUint32T NumReaders;
    KviCsSemaphore WriteMutex;
    KviCsSemaphore ReadMutex;
    KviCsSemaphore Access;
    KviCsSemaphore Read;
    KviCsSemaphore ReadWrite;
} KviCsRwLockT;

#define KVI_RW_LOCK_PARAMS_ const char *FileName, const char *FuncName, int LineNum, KviCsRwLockT *RwLock
KVI_API SaErrorT kviCsRwLockInit(KVI_RW_LOCK_PARAMS_) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockDestroy(KVI_RW_LOCK_PARAMS_) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockRdLock(KVI_RW_LOCK_PARAMS_, SaHpiUint32T Timeout) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockWrLock(KVI_RW_LOCK_PARAMS_, SaHpiUint32T Timeout) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockTryRdLock(KVI_RW_LOCK_PARAMS_) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockTryWrLock(KVI_RW_LOCK_PARAMS_) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockRdUnlock(KVI_RW_LOCK_PARAMS_) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRwLockWrUnlock(KVI_RW_LOCK_PARAMS_) KVI_NOEXCEPT;
#undef KVI_RW_LOCK_PARAMS_

#define KVI_CS_RW_LOCK_CALL_(fn, ...) fn(__FILE__, __func__, __LINE__, __VA_ARGS__)
#define KVI_CS_RW_LOCK_INIT(RwLock) KVI_CS_RW_LOCK_CALL_(kviCsRwLockInit, (RwLock))
#define KVI_CS_RW_LOCK_DESTROY(RwLock) KVI_CS_RW_LOCK_CALL_(kviCsRwLockDestroy, (RwLock))
#define KVI_CS_RW_LOCK_RD_LOCK(RwLock, Timeout)                                                   \
    KVI_CS_RW_LOCK_CALL_(kviCsRwLockRdLock, (RwLock), (Timeout))
#define KVI_CS_RW_LOCK_WR_LOCK(RwLock, Timeout)                                                   \
    KVI_CS_RW_LOCK_CALL_(kviCsRwLockWrLock, (RwLock), (Timeout))
#define KVI_CS_RW_LOCK_TRY_RD_LOCK(RwLock) KVI_CS_RW_LOCK_CALL_(kviCsRwLockTryRdLock, (RwLock))
#define KVI_CS_RW_LOCK_TRY_WR_LOCK(RwLock) KVI_CS_RW_LOCK_CALL_(kviCsRwLockTryWrLock, (RwLock))
#define KVI_CS_RW_LOCK_RD_UNLOCK(RwLock) KVI_CS_RW_LOCK_CALL_(kviCsRwLockRdUnlock, (RwLock))
#define KVI_CS_RW_LOCK_WR_UNLOCK(RwLock) KVI_CS_RW_LOCK_CALL_(kviCsRwLockWrUnlock, (RwLock))

#define KVI_CS_DOA_RW_UNLOCK_(UNLOCK, Name, RwLock)                                               \
    do {                                                                                          \
        SaErrorT kviDoaRc_ = UNLOCK(RwLock);                                                      \
        if (kviDoaRc_ != SA_OK) {                                                                 \
            KVI_ELOG(KVI_LOG_ERR_FATAL, Name " on " #RwLock " returned %d", kviDoaRc_);           \
            exit(1);                                                                              \
        }                                                                                         \
    } while (0)
#define KVI_CS_DOA_RW_LOCK_RD_UNLOCK(RwLock)                                                      \
    KVI_CS_DOA_RW_UNLOCK_(KVI_CS_RW_LOCK_RD_UNLOCK, "kviCsRwLockRdUnlock", RwLock)
#define KVI_CS_DOA_RW_LOCK_WR_UNLOCK(RwLock)                                                      \
    KVI_CS_DOA_RW_UNLOCK_(KVI_CS_RW_LOCK_WR_UNLOCK, "kviCsRwLockWrUnlock", RwLock)

KVI_EXTERN_C_END

#endif
