/* Resource data record (RDR) repositories: one per resource of the RPT.
 *
 * Records are added by plug-ins while their resource is inactive and are
 * looked up by type and number to route sensor, control, inventory and
 * watchdog calls. Every operation runs under the RPT lock of the domain;
 * the helpers at the end expect the caller to hold it already. */
#ifndef KVI_RDR_H
#define KVI_RDR_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMemory.h"
#include "kvi/KviRwLock.h"

KVI_EXTERN_C_BEGIN

/* Number of hash lists of a repository until kviCsRdrHashSizeSet says else. */
#define KVI_CS_DEFAULT_RDR_HASH_SIZE 3

/* The records of one resource: a record lives in list RecordId mod HashSize,
 * appended at the tail; its entry id is its record id. */
typedef struct __KviCsRdrRepositoryContainerT {
    KviCsLinkedListT *RdrList;
    SaHpiUint32T HashSize;
    SaHpiUint32T NextRecordId;
    SaHpiEirIdT DefaultEirId;
    SaHpiWatchdogNumT DefaultWatchdogNum;
} KviCsRdrRepositoryContainerT;

/* One record with what the plug-in registered along with it. */
typedef struct __KviCsRdrContainerT {
    SaHpiRdrT Rdr;
    KviDsRdrFnTable FnTable;
    void *UserDefined;
} KviCsRdrContainerT;

/* The number a new record was given (the low 8 bits of its record id). */
typedef union __KviCsRdrRecordNumT {
    SaHpiCtrlNumT ControlNum;
    SaHpiEirIdT EirNum;
    SaHpiSensorNumT SensorNum;
    SaHpiWatchdogNumT WatchdogNum;
} KviCsRdrRecordNumT;

KVI_API SaErrorT kviCsRdrInitialize(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrInitializeGlobalHashSizeSemaphore(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrHashSizeSet(SaHpiUint32T HashSize) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrHashSizeGet(SaHpiUint32T *HashSize) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsRdrRepositoryContainerInitialize(
    KviCsRdrRepositoryContainerT *RdrRepositoryContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrRepositoryRemove(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                          KviCsRdrRepositoryContainerT *RdrRepositoryContainer)
    KVI_NOEXCEPT;

/* Adds a record to an inactive resource. The record's number and record id
 * are written into RdrEntry as well as into the outputs. */
KVI_API SaErrorT kviCsRdrAdd(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                             SaHpiRdrT *RdrEntry, void *UserDefined, KviDsRdrFnTable *FnTable,
                             SaHpiEntryIdT *RecordId, KviCsRdrRecordNumT *RecordNum) KVI_NOEXCEPT;

/* One record of a type (SAHPI_NO_RECORD: any) with everything needed to call
 * its plug-in. Outputs other than Active may be NULL when not wanted. */
KVI_API SaErrorT kviCsRdrGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                             SaHpiRdrTypeT RdrType, SaHpiEntryIdT EntryId,
                             SaHpiEntryIdT *NextEntryId, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                             void **UserDefined, KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                             KviCsRwLockT **MaplLock) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrGetSensor(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                   void **UserDefined, KviDsRdrFnTable *FnTable,
                                   SaHpiUint32T *MaplNum, KviCsRwLockT **MaplLock) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrGetControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiCtrlNumT CtrlNum, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                    void **UserDefined, KviDsRdrFnTable *FnTable,
                                    SaHpiUint32T *MaplNum, KviCsRwLockT **MaplLock) KVI_NOEXCEPT;
/* Number 0 (SAHPI_DEFAULT_INVENTORY_ID / SAHPI_DEFAULT_WATCHDOG_NUM) asks for
 * the resource's default record. */
KVI_API SaErrorT kviCsRdrGetEir(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiEirIdT EirNum, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                void **UserDefined, KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                                KviCsRwLockT **MaplLock) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrGetWatchdog(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiWatchdogNumT WatchdogNum, SaHpiRdrT *Rdr,
                                     SaHpiBoolT *Active, void **UserDefined,
                                     KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                                     KviCsRwLockT **MaplLock) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsDefaultEirSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiEirIdT EirId) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDefaultEirGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiEirIdT *EirId) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDefaultWatchdogSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiWatchdogNumT WatchdogNum) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDefaultWatchdogGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiWatchdogNumT *WatchdogNum) KVI_NOEXCEPT;

/* Helpers on one repository; the caller holds the RPT lock. */
KVI_API SaErrorT kviCsRdrGetRdrContainer(KviCsRdrRepositoryContainerT *RdrRepositoryContainer,
                                         SaHpiEntryIdT EntryId,
                                         KviCsRdrContainerT **RdrContainer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrGetNextEntry(KviCsRdrRepositoryContainerT *RdrContainerToSearch,
                                      SaHpiEntryIdT CurrentEntry,
                                      SaHpiEntryIdT *NextEntryId) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrGetNodeFromLinkedList(KviCsLinkedListT *ListIn, SaHpiEntryIdT EntryId,
                                               KviCsLinkedListNodeT **Node) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsRdrGivenRepositoryRemoveEntry(
    SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
    KviCsRdrRepositoryContainerT *RdrRepositoryContainer, SaHpiEntryIdT EntryId) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
