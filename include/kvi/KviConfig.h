/* The configuration file of key = "value" lines: containers, queries and
 * change callbacks. A null container pointer means the default container. */
#ifndef KVI_CONFIG_H
#define KVI_CONFIG_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviMemory.h"
#include "kvi/KviSemaphore.h"
#include "kvi/KviThread.h"

KVI_EXTERN_C_BEGIN

typedef struct {
    char *Key;
    char *Value;
} KviKeyValuePairT;

typedef void (*KviCsCfgCallback)(void);

typedef struct {
    SaHpiUint32T CountAllocated;
    KviCsCfgCallback Entry[];
} KviCsCfgCallbackList;

typedef struct {
    KviCsLinkedListT *KeyValueList;
    char *Filename;
    SaHpiInt64T UpdateTime;
    SaHpiBoolT ShuttingDown;
    KviCsThreadId *ThreadIdPtr;
    SaHpiBoolT HasThread;
    KviCsSemaphore GeneralSem;
    KviCsSemaphore DeleteSem;
    KviCsCfgCallbackList *CallbackList;
    SaHpiUint32T CallbackCount;
} KviCsCfgContainer;

KVI_API SaErrorT kviCsConfigInit(SaHpiBoolT SupportWaitingThread, const char *FileName) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigFinalize(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigInitStructure(KviCsCfgContainer *ConfigContainer,
                                          SaHpiBoolT SupportWaitingThread,
                                          const char *FileName) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigFinalizeStrucure(KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigRegister(KviCsCfgCallback FnPtr,
                                     KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigUnregister(KviCsCfgCallback FnPtr,
                                       KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigProcessChanges(KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsConfigAddWaitingThread(KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsCfgDataGet(const char *Key, SaHpiUint32T Size, char *Value,
                                 KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsCfgDataUint32Get(const char *Key, SaHpiUint32T *Value,
                                       KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsCfgDataInt32Get(const char *Key, SaHpiInt32T *Value,
                                      KviCsCfgContainer *CfgContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviGetListElement(SaHpiUint32T ElementToGet, const char *StringToParse,
                                   SaHpiUint32T ResultMaxSize, char *Result) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
