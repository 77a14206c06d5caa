// The operations of the resource presence table. Each takes the RPT lock
// itself and holds it for the whole call, plug-in callbacks included, so a
// client never sees an entry half added or half removed.
#include <cstdlib>

#include "core/SaHpi/rpt/RptHelpers.h"
#include "kvi/KviDomain.h"
#include "kvi/KviParmControl.h"

namespace
{
// Logs at the position of the operation that a shared frame works for.
#define KVI_SITE_LOG(Site, LevelNum, ...)                                                          \
    kviCsLogger((Site).file, static_cast<SaHpiInt16T>((Site).line), (Site).func, (LevelNum),       \
                __VA_ARGS__)

// Ids that no by-id change accepts. SAHPI_DOMAIN_CONTROLLER_ID is among them
// although the generator may hand it out after a wrap.
bool isReservedId(SaHpiResourceIdT ResourceId)
{
    return ResourceId == SAHPI_FIRST_ENTRY || ResourceId == SAHPI_LAST_ENTRY ||
           ResourceId == SAHPI_UNSPECIFIED_RESOURCE_ID || ResourceId == SAHPI_DOMAIN_CONTROLLER_ID;
}

#define CHECK_RESOURCE_ID(ResourceId)                                                              \
    do {                                                                                           \
        if (isReservedId(ResourceId)) {                                                            \
            KVI_DLOG(KVI_LOG_DBG_H, "Cannot use SAHPI_FIRST_ENTRY or SAHPI_LAST_ENTRY or "         \
                                    "SAHPI_UNSPECIFIED_RESOURCE_ID for Modify");                   \
            return SA_ERR_HPI_INVALID_RESOURCE;                                                    \
        }                                                                                          \
    } while (0)

// The caller's result for a lock of the table that did not come.
SaErrorT lockRptFailure(const KviCallSite &Site, SaErrorT Rc)
{
    if (Rc == SA_ERR_HPI_BUSY) {
        KVI_SITE_LOG(Site, KVI_LOG_WARN_NUM, "kviCsRprLockRpt returned busy");
        return Rc;
    }
    KVI_SITE_LOG(Site, KVI_LOG_ERR_NONFATAL_NUM, "kviCsRptLockRpt failed.  Returned %d", Rc);
    return (Rc == SA_ERR_HPI_INVALID_DOMAIN || Rc == SA_ERR_HPI_ERROR) ? Rc : SA_ERR_HPI_ERROR;
}

// Holds the table's lock for the rest of the scope, or returns the failure.
#define LOCK_RPT(Lock, DomainId)                                                                   \
    KviRptLock Lock(DomainId);                                                                     \
    if (!Lock.held())                                                                              \
    return lockRptFailure(KVI_CALL_SITE(""), Lock.result())

// An unknown id is passed on as it is; anything else is a broken table.
SaErrorT getRptEntryContainer(const KviCallSite &Site, KviCsRptContainerT *Rpt,
                              SaHpiResourceIdT ResourceId, KviCsRptEntryContainerT **Entry)
{
    SaErrorT rc = kviCsRptGetRptEntryContainer(Rpt, ResourceId, Entry);
    if (rc == SA_ERR_HPI_NOT_PRESENT || rc == SA_ERR_HPI_INVALID_RESOURCE)
        KVI_SITE_LOG(Site, KVI_LOG_DBG_H_NUM, "Unable to recover RPTEntryContainer.  Returned %d",
                     rc);
    else if (rc != SA_OK)
        KVI_SITE_LOG(Site, KVI_LOG_ERR_NONFATAL_NUM,
                     "Unable to recover RPTEntryContainer.  Returned %d", rc);
    return (rc == SA_OK || rc == SA_ERR_HPI_NOT_PRESENT || rc == SA_ERR_HPI_INVALID_RESOURCE)
               ? rc
               : SA_ERR_HPI_ERROR;
}

#define GET_RPT_ENTRY_CONTAINER(Rpt, ResourceId, Entry)                                            \
    getRptEntryContainer(KVI_CALL_SITE(""), (Rpt), (ResourceId), (Entry))

// The frame of the by-id operations: the table locked and one entry found
// for the rest of the scope.
class RptEntryScope
{
  public:
    RptEntryScope(const KviCallSite &Site, SaHpiDomainIdT DomainId,
                  SaHpiResourceIdT ResourceId) noexcept
        : lock_(DomainId)
    {
        rc_ = lock_.held() ? getRptEntryContainer(Site, lock_.rpt(), ResourceId, &entry_)
                           : lockRptFailure(Site, lock_.result());
    }
    SaErrorT result() const noexcept { return rc_; }
    KviCsRptContainerT *rpt() const noexcept { return lock_.rpt(); }
    KviCsRptEntryContainerT *entry() const noexcept { return entry_; }
    // Counts one change of the table in its RptInfo.
    void changed() const noexcept { kviCsRptUpdateInfo(&rpt()->RptInfo); }

  private:
    KviRptLock lock_;
    KviCsRptEntryContainerT *entry_ = nullptr;
    SaErrorT rc_;
};

#define LOCK_RPT_ENTRY(Scope, DomainId, ResourceId)                                                \
    RptEntryScope Scope(KVI_CALL_SITE(""), (DomainId), (ResourceId));                              \
    if (Scope.result() != SA_OK)                                                                   \
    return Scope.result()

// The settings of an entry that are kept across a restart of the daemon.
enum class NvSetting { Tag, Severity };

// Tag and severity changes are kept across a restart (flag-1 keys, put back
// by the daemon restore); saved with the RPT lock still held.
SaErrorT saveToNonVolatile(NvSetting Setting, SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                           const SaHpiRptEntryT &Entry)
{
    if (Setting == NvSetting::Tag)
        return kviCsSaveResTagNV(DomainId, ResourceId, SAHPI_TRUE, &Entry.ResourceTag);
    return kviCsSaveResSeverityNV(DomainId, ResourceId, SAHPI_TRUE, &Entry.ResourceSeverity);
}

// The first entry after From in the walk that is active, or SAHPI_LAST_ENTRY
// (which the walk reports as active).
SaErrorT nextActiveEntry(KviCsRptContainerT *Rpt, SaHpiEntryIdT From, SaHpiEntryIdT *Next)
{
    SaHpiBoolT active = SAHPI_FALSE;
    SaHpiEntryIdT cursor = From;
    do {
        SaErrorT rc = kviCsRptGetNextEntry(Rpt, cursor, &cursor, &active);
        if (rc != SA_OK)
            return rc;
    } while (!active);
    *Next = cursor;
    return SA_OK;
}

void copyOut(const KviCsRptEntryContainerT *Entry, SaHpiRptEntryT *RptEntry, void **UserDefined)
{
    if (RptEntry != nullptr)
        *RptEntry = Entry->RptEntry;
    if (UserDefined != nullptr)
        *UserDefined = Entry->UserDefined;
}

// Files a new entry's node in the list of its resource id, with an empty
// record repository. On failure nothing of the entry is left behind.
SaErrorT fileEntryNode(SaHpiDomainIdT DomainId, KviCsRptContainerT *Rpt, KviCsLinkedListNodeT *Node)
{
    auto *entry = static_cast<KviCsRptEntryContainerT *>(Node->Data);
    SaHpiResourceIdT id = entry->RptEntry.ResourceId;
    SaErrorT rc = kviCsRdrRepositoryContainerInitialize(&entry->RdrRepositoryContainer);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRdrRepositoryContainerInitialize Returned %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    if (kviCsLinkedListAddToTail(&Rpt->RptEntryList[id % Rpt->HashSize], Node) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to add node to tail");
        kviCsRdrRepositoryRemove(DomainId, id, &entry->RdrRepositoryContainer);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

// Takes a filled container into the table under its resource id.
SaErrorT fileNewEntry(SaHpiDomainIdT DomainId, KviCsRptContainerT *Rpt,
                      const KviCsRptEntryContainerT &Fill)
{
    auto *entry = static_cast<KviCsRptEntryContainerT *>(KVI_CS_MALLOC(sizeof(Fill)));
    if (entry == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to allocate memory.  Returned %d",
                 SA_ERR_HPI_OUT_OF_SPACE);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    KviCsLinkedListNodeT *node = nullptr;
    SaErrorT rc = kviCsLinkedListNodeMalloc(&node);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to allocate node.  Returned %d", rc);
        KVI_CS_FREE(entry);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    *entry = Fill;
    node->Data = entry;
    rc = fileEntryNode(DomainId, Rpt, node);
    if (rc != SA_OK) {
        KVI_CS_FREE(entry);
        kviCsLinkedListNodeFree(node);
    }
    return rc;
}

using KviRptEntryMatch = bool (*)(const KviCsRptEntryContainerT *Entry, const void *Owner);

bool ownedByMapl(const KviCsRptEntryContainerT *Entry, const void *Owner)
{
    return Entry->MaplNum == *static_cast<const SaHpiUint32T *>(Owner);
}

bool ownedByLock(const KviCsRptEntryContainerT *Entry, const void *Owner)
{
    return Entry->MaplLock == Owner;
}

// Removes every entry that belongs to one owner. The cursor stays on the last
// entry kept, so the next step finds whatever followed a removed entry. A
// failure here leaves a plug-in half unloaded, which is not survivable.
SaErrorT removeOwnedEntries(const KviCallSite &Site, SaHpiDomainIdT DomainId,
                            KviRptEntryMatch Belongs, const void *Owner)
{
    KviRptLock lock(DomainId);
    if (!lock.held())
        return lockRptFailure(Site, lock.result());
    SaHpiEntryIdT cursor = SAHPI_FIRST_ENTRY;
    for (;;) {
        SaHpiEntryIdT next = SAHPI_LAST_ENTRY;
        SaHpiBoolT active = SAHPI_FALSE;
        KviCsRptEntryContainerT *entry = nullptr;
        SaErrorT rc = kviCsRptGetNextEntry(lock.rpt(), cursor, &next, &active);
        if (rc == SA_ERR_HPI_INVALID_REQUEST || (rc == SA_OK && next == SAHPI_LAST_ENTRY))
            return SA_OK;
        if (rc == SA_OK)
            rc = kviCsRptGetRptEntryContainer(lock.rpt(), next, &entry);
        if (rc != SA_OK) {
            KVI_SITE_LOG(Site, KVI_LOG_ERR_FATAL_NUM, "Unexpected error.  rc=%d", rc);
            lock.release();
            exit(1);
        }
        if (!Belongs(entry, Owner)) {
            cursor = next;
            continue;
        }
        SaHpiUint32T maplNum = entry->MaplNum;
        if (kviCsRptEntryRemoveByRidNoLock(DomainId, next, lock.rpt()) != SA_OK) {
            KVI_SITE_LOG(Site, KVI_LOG_ERR_FATAL_NUM,
                         "Unable to unload an entry.  MaplNum(%d) DomainId(%d) ResourceId(%d)",
                         maplNum, DomainId, next);
            exit(1);
        }
    }
}

bool validTag(const SaHpiTextBufferT *Tag)
{
    SaHpiUint32T dataType = kviRawEnum(Tag->DataType);
    SaHpiUint32T language = kviRawEnum(Tag->Language);
    if (dataType > SAHPI_TL_TYPE_LANGUAGE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value (%d) in Tag.DataType.", dataType);
        return false;
    }
    if (language > SAHPI_LANG_ZULU) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value (%d) in Tag.Language.", language);
        return false;
    }
    return true;
}

bool validSeverity(SaHpiSeverityT Severity)
{
    SaHpiUint32T value = kviRawEnum(Severity);
    return value <= SAHPI_OK || value == SAHPI_DEBUG;
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsRptInitialize(void) noexcept
{
    KVI_TRACE("");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptGetRptContainer(SaHpiDomainIdT DomainId,
                                            KviCsRptContainerT **RptContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    return kviCsGetRptContainerByDomainId(DomainId, RptContainer);
}

KVI_EXPORT SaErrorT kviCsRptEntryAdd(SaHpiDomainIdT DomainId, SaHpiRptEntryT RptEntry,
                                     void *UserDefined, SaHpiBoolT Active, KviDsRptFnTable *FnTable,
                                     SaHpiUint32T MaplNum, KviCsRwLockT *MaplLock,
                                     SaHpiResourceIdT *ResourceId) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ResourceId);
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(MaplLock);
    LOCK_RPT(lock, DomainId);
    SaHpiResourceIdT id = 0;
    SaErrorT rc = kviCsRptGenerateResourceId(lock.rpt(), &id);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRptGenerateResourceId failed.  Returned %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    // The id is spent from here on, whatever happens to the entry.
    *ResourceId = id;
    RptEntry.ResourceId = id;
    KviCsRptEntryContainerT fill{};
    fill.RptEntry = RptEntry;
    fill.UserDefined = UserDefined;
    fill.Active = Active;
    fill.MaplLock = MaplLock;
    fill.MaplNum = MaplNum;
    fill.FnTable = *FnTable;
    rc = fileNewEntry(DomainId, lock.rpt(), fill);
    if (rc != SA_OK)
        return rc;
    if (kviCsRptUpdateInfo(&lock.rpt()->RptInfo) != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to update RPT Info");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryGet(SaHpiDomainIdT DomainId, SaHpiEntryIdT EntryId,
                                     SaHpiEntryIdT *NextEntryId, SaHpiRptEntryT *RptEntry,
                                     SaHpiBoolT *Active, void **UserDefined) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Active);
    if (EntryId == SAHPI_LAST_ENTRY) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value for EntryId (%#x)", EntryId);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    LOCK_RPT(lock, DomainId);
    SaHpiEntryIdT id = EntryId;
    SaHpiBoolT ignored = SAHPI_FALSE;
    if (EntryId == SAHPI_FIRST_ENTRY) {
        SaErrorT rc = kviCsRptGetNextEntry(lock.rpt(), SAHPI_FIRST_ENTRY, &id, &ignored);
        if (rc != SA_OK) {
            KVI_DLOG(KVI_LOG_DBG_H, "kviCsRptGetNextEntry failed.  Returned %d", rc);
            return rc == SA_ERR_HPI_INVALID_REQUEST ? SA_ERR_HPI_NOT_PRESENT : SA_ERR_HPI_ERROR;
        }
    }
    KviCsRptEntryContainerT *entry = nullptr;
    SaErrorT rc = GET_RPT_ENTRY_CONTAINER(lock.rpt(), id, &entry);
    if (rc != SA_OK)
        return rc;
    copyOut(entry, RptEntry, UserDefined);
    *Active = entry->Active;
    if (NextEntryId != nullptr &&
        kviCsRptGetNextEntry(lock.rpt(), id, NextEntryId, &ignored) != SA_OK)
        return SA_ERR_HPI_ERROR;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptActiveEntryGet(SaHpiDomainIdT DomainId, SaHpiEntryIdT EntryId,
                                           SaHpiEntryIdT *NextEntryId, SaHpiRptEntryT *RptEntry,
                                           void **UserPointer) noexcept
{
    KVI_TRACE("");
    if (EntryId == SAHPI_LAST_ENTRY) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value for EntryId (%#x)", EntryId);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    LOCK_RPT(lock, DomainId);
    SaHpiEntryIdT id = EntryId;
    if (EntryId == SAHPI_FIRST_ENTRY) {
        SaErrorT rc = nextActiveEntry(lock.rpt(), SAHPI_FIRST_ENTRY, &id);
        if (rc == SA_ERR_HPI_INVALID_REQUEST || (rc == SA_OK && id == SAHPI_LAST_ENTRY)) {
            KVI_DLOG(KVI_LOG_DBG_H, "No active entries found.");
            return SA_ERR_HPI_NOT_PRESENT;
        }
        if (rc != SA_OK)
            return SA_ERR_HPI_ERROR;
    }
    KviCsRptEntryContainerT *entry = nullptr;
    SaErrorT rc = GET_RPT_ENTRY_CONTAINER(lock.rpt(), id, &entry);
    if (rc != SA_OK)
        return rc;
    copyOut(entry, RptEntry, UserPointer);
    if (NextEntryId != nullptr && nextActiveEntry(lock.rpt(), id, NextEntryId) != SA_OK)
        return SA_ERR_HPI_ERROR;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryGetByRid(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                          SaHpiRptEntryT *RptEntry, SaHpiBoolT *Active,
                                          void **UserDefined) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Active);
    return kviCsRptEntryGet(DomainId, ResourceId, nullptr, RptEntry, Active, UserDefined);
}

KVI_EXPORT SaErrorT kviCsRptActiveEntryGetByRid(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId,
                                                SaHpiRptEntryT *RptEntry, KviDsRptFnTable *FnTable,
                                                void **UserDefined, SaHpiUint32T *MaplNum,
                                                KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("");
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    const KviCsRptEntryContainerT *entry = scope.entry();
    if (!entry->Active) {
        KVI_DLOG(KVI_LOG_DBG_H, "Resource %u is inactive", ResourceId);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    copyOut(entry, RptEntry, UserDefined);
    if (FnTable != nullptr)
        *FnTable = entry->FnTable;
    if (MaplNum != nullptr)
        *MaplNum = entry->MaplNum;
    if (MaplLock != nullptr)
        *MaplLock = entry->MaplLock;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryModifyByRid(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                             SaHpiRptEntryT RptEntry,
                                             KviDsRptFnTable *FnTable) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    KviCsRptEntryContainerT *entry = scope.entry();
    if (entry->Active) {
        KVI_WLOG(KVI_LOG_WARN, "Entry Container is Active, refusing to modify.");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    entry->RptEntry = RptEntry;
    entry->RptEntry.EntryId = ResourceId;
    entry->RptEntry.ResourceId = ResourceId;
    if (FnTable != nullptr)
        entry->FnTable = *FnTable;
    scope.changed();
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryRemoveByRid(SaHpiDomainIdT DomainId,
                                             SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    LOCK_RPT(lock, DomainId);
    return kviCsRptEntryRemoveByRidNoLock(DomainId, ResourceId, lock.rpt());
}

KVI_EXPORT SaErrorT kviCsRptEntryUserPointerSetByRid(SaHpiDomainIdT DomainId,
                                                     SaHpiResourceIdT ResourceId, void *UserDefined,
                                                     void **OldPointer) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    KVI_NULL_CHECK(OldPointer);
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    *OldPointer = scope.entry()->UserDefined;
    scope.entry()->UserDefined = UserDefined;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryUserPointerGetByRid(SaHpiDomainIdT DomainId,
                                                     SaHpiResourceIdT ResourceId,
                                                     void **UserDefined) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    KVI_NULL_CHECK(UserDefined);
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    *UserDefined = scope.entry()->UserDefined;
    return SA_OK;
}

// Entries only ever become active: what clients have seen does not vanish
// short of removal.
KVI_EXPORT SaErrorT kviCsRptEntryActiveStateSetByRid(SaHpiDomainIdT DomainId,
                                                     SaHpiResourceIdT ResourceId,
                                                     SaHpiBoolT Active) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    if (Active > SAHPI_TRUE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Non-Bool value (%d) in Active.", Active);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (!Active) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Transition to Inactive is invalid.");
        return SA_ERR_HPI_INVALID;
    }
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    scope.entry()->Active = SAHPI_TRUE;
    scope.changed();
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryModifyTagByRid(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId,
                                                SaHpiTextBufferT *Tag) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    KVI_NULL_CHECK(Tag);
    if (!validTag(Tag))
        return SA_ERR_HPI_INVALID_PARAMS;
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    KviCsRptEntryContainerT *entry = scope.entry();
    if (!entry->Active) {
        KVI_WLOG(KVI_LOG_WARN, "Called on Inactive Resource: %d", ResourceId);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    entry->RptEntry.ResourceTag = *Tag;
    scope.changed();
    SaErrorT rc = saveToNonVolatile(NvSetting::Tag, DomainId, ResourceId, entry->RptEntry);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsSaveResTagNV failed. rc=%d", rc);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryModifySeverityByRid(SaHpiDomainIdT DomainId,
                                                     SaHpiResourceIdT ResourceId,
                                                     SaHpiSeverityT Severity) noexcept
{
    KVI_TRACE("");
    CHECK_RESOURCE_ID(ResourceId);
    if (!validSeverity(Severity)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value for severity(%d)", kviRawEnum(Severity));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    LOCK_RPT_ENTRY(scope, DomainId, ResourceId);
    KviCsRptEntryContainerT *entry = scope.entry();
    if (!entry->Active) {
        KVI_WLOG(KVI_LOG_WARN, "Called on Inactive Resource: %d", ResourceId);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    entry->RptEntry.ResourceSeverity = Severity;
    scope.changed();
    SaErrorT rc = saveToNonVolatile(NvSetting::Severity, DomainId, ResourceId, entry->RptEntry);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviIsSaveResSeverityNV failed. rc=%d", rc);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptInfoGet(SaHpiDomainIdT DomainId, SaHpiRptInfoT *RptInfo) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptInfo);
    LOCK_RPT(lock, DomainId);
    *RptInfo = lock.rpt()->RptInfo;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntrysRemoveByMapl(SaHpiDomainIdT DomainId,
                                               SaHpiUint32T MaplNum) noexcept
{
    KVI_TRACE("");
    return removeOwnedEntries(KVI_CALL_SITE(""), DomainId, ownedByMapl, &MaplNum);
}

KVI_EXPORT SaErrorT kviCsRptEntrysRemoveByLock(SaHpiDomainIdT DomainId,
                                               KviCsRwLockT *MaplLock) noexcept
{
    KVI_TRACE("");
    return removeOwnedEntries(KVI_CALL_SITE(""), DomainId, ownedByLock, MaplLock);
}

} // extern "C"
