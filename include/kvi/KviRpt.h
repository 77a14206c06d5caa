/* The resource presence table (RPT) of the domain.
 *
 * Plug-ins add the resources they discover; the front end reads entries,
 * changes tags and severities and looks up the plug-in that owns a resource.
 * The entry id of this table is the resource id. Every operation takes the
 * RPT lock itself; the helpers at the end expect the caller to hold it (the
 * lock is not reentrant). */
#ifndef KVI_RPT_H
#define KVI_RPT_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMemory.h"
#include "kvi/KviRdr.h"
#include "kvi/KviRwLock.h"
#include "kvi/KviSemaphore.h"

KVI_EXTERN_C_BEGIN

/* Number of hash lists of the table: an entry lives in list ResourceId mod 5. */
#define KVI_CS_DEFAULT_RPT_HASH_SIZE 5

/* The table of one domain. LastResourceId is the next candidate id. */
typedef struct __KviCsRptContainerT {
    KviCsLinkedListT *RptEntryList;
    SaHpiUint32T HashSize;
    SaHpiRptInfoT RptInfo;
    KviCsSemaphore Semaphore;
    SaHpiResourceIdT LastResourceId;
} KviCsRptContainerT;

/* One resource with what its plug-in registered along with it. */
typedef struct __KviCsRptEntryContainerT {
    SaHpiRptEntryT RptEntry;
    void *UserDefined;
    KviCsRdrRepositoryContainerT RdrRepositoryContainer;
    SaHpiBoolT Active;
    KviDsRptFnTable FnTable;
    SaHpiUint32T MaplNum;
    KviCsRwLockT *MaplLock;
} KviCsRptEntryContainerT;

KVI_API SaErrorT kviCsRptInitialize(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptGetRptContainer(SaHpiDomainIdT DomainId,
                                         KviCsRptContainerT **RptContainer) KVI_NOEXCEPT;

/* Adds a resource under a new id; the plug-in's table is copied. */
KVI_API SaErrorT kviCsRptEntryAdd(SaHpiDomainIdT DomainId, SaHpiRptEntryT RptEntry,
                                  void *UserDefined, SaHpiBoolT Active, KviDsRptFnTable *FnTable,
                                  SaHpiUint32T MaplNum, KviCsRwLockT *MaplLock,
                                  SaHpiResourceIdT *ResourceId) KVI_NOEXCEPT;

/* Reading. Outputs other than Active may be NULL when not wanted. */
KVI_API SaErrorT kviCsRptEntryGet(SaHpiDomainIdT DomainId, SaHpiEntryIdT EntryId,
                                  SaHpiEntryIdT *NextEntryId, SaHpiRptEntryT *RptEntry,
                                  SaHpiBoolT *Active, void **UserDefined) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptActiveEntryGet(SaHpiDomainIdT DomainId, SaHpiEntryIdT EntryId,
                                        SaHpiEntryIdT *NextEntryId, SaHpiRptEntryT *RptEntry,
                                        void **UserPointer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryGetByRid(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiRptEntryT *RptEntry, SaHpiBoolT *Active,
                                       void **UserDefined) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptActiveEntryGetByRid(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                             SaHpiRptEntryT *RptEntry, KviDsRptFnTable *FnTable,
                                             void **UserDefined, SaHpiUint32T *MaplNum,
                                             KviCsRwLockT **MaplLock) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptInfoGet(SaHpiDomainIdT DomainId, SaHpiRptInfoT *RptInfo) KVI_NOEXCEPT;

/* Changes. An entry may be replaced while inactive, made active once, and
 * then only its tag and severity change. */
KVI_API SaErrorT kviCsRptEntryModifyByRid(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                          SaHpiRptEntryT RptEntry,
                                          KviDsRptFnTable *FnTable) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryActiveStateSetByRid(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId,
                                                  SaHpiBoolT Active) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryModifyTagByRid(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                             SaHpiTextBufferT *Tag) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryModifySeverityByRid(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId,
                                                  SaHpiSeverityT Severity) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryUserPointerSetByRid(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId, void *UserDefined,
                                                  void **OldPointer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryUserPointerGetByRid(SaHpiDomainIdT DomainId,
                                                  SaHpiResourceIdT ResourceId,
                                                  void **UserDefined) KVI_NOEXCEPT;

/* Removal; the plug-in's RptEntryResourcesRemove is called for each entry. */
KVI_API SaErrorT kviCsRptEntryRemoveByRid(SaHpiDomainIdT DomainId,
                                          SaHpiResourceIdT ResourceId) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntrysRemoveByMapl(SaHpiDomainIdT DomainId,
                                            SaHpiUint32T MaplNum) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntrysRemoveByLock(SaHpiDomainIdT DomainId,
                                            KviCsRwLockT *MaplLock) KVI_NOEXCEPT;

/* Helpers; the caller holds the RPT lock. */
KVI_API SaErrorT kviCsRptGenerateResourceId(KviCsRptContainerT *RptContainer,
                                            SaHpiResourceIdT *ResourceId) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptGetNextEntry(KviCsRptContainerT *RptContainerToSearch,
                                      SaHpiEntryIdT CurrentEntry, SaHpiEntryIdT *NextEntry,
                                      SaHpiBoolT *Active) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptGetNode(KviCsRptContainerT *RptContainer, SaHpiResourceIdT ResourceId,
                                 KviCsLinkedListNodeT **Node) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptGetNodeFromLinkedList(KviCsLinkedListT *ListIn,
                                               SaHpiResourceIdT ResourceId,
                                               KviCsLinkedListNodeT **Node) KVI_NOEXCEPT;
KVI_API SaErrorT
kviCsRptGetRptEntryContainer(KviCsRptContainerT *RptContainer, SaHpiResourceIdT ResourceId,
                             KviCsRptEntryContainerT **RptEntryContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptEntryRemoveByRidNoLock(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId,
                                                KviCsRptContainerT *RptContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRptUpdateInfo(SaHpiRptInfoT *RptInfo) KVI_NOEXCEPT;

/* The lock of the table (wait up to 5000 ms; SA_ERR_HPI_BUSY when it does
 * not come). Unlocking a table that is not locked ends the process. */
KVI_API SaErrorT kviCsRptLockRpt(SaHpiDomainIdT DomainId,
                                 KviCsRptContainerT **RptContainer) KVI_NOEXCEPT;
KVI_API void kviCsRptUnlockRpt(KviCsRptContainerT *RptContainer) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
