/* Thin wrapper over POSIX threads with the library's result codes. */
#ifndef KVI_THREAD_H
#define KVI_THREAD_H

#include <pthread.h>

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

typedef pthread_t KviCsThreadId;
typedef void *(*KviCsThreadFuncT)(void *);

KVI_API SaErrorT kviCsCreateThread(KviCsThreadId *ThreadId, KviCsThreadFuncT func,
                                   void *Arguments) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsJoinThread(KviCsThreadId *ThreadId, void **ThreadRet) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDetachThread(KviCsThreadId *ThreadId) KVI_NOEXCEPT;
KVI_API void kviCsThreadExit(void *ThreadRet) KVI_NOEXCEPT __attribute__((noreturn));
KVI_API SaErrorT kviCsThreadNum(SaHpiUint32T *ThreadNum) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
