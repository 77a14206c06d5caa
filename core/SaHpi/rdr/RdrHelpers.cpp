// Lookup, walk and removal of records in one repository. The caller holds the
// RPT lock of the domain; nothing here takes a lock.
#include "core/SaHpi/rdr/RdrHelpers.h"

#include <cstdint>

namespace
{
SaHpiUint32T addressOf(const void *Pointer)
{
    return static_cast<SaHpiUint32T>(reinterpret_cast<uintptr_t>(Pointer));
}

// Lets the plug-in free what it hung on the record; a failure there costs
// at most its own memory, so removal goes on.
void callCleanup(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, KviCsRdrContainerT *Record)
{
    if (Record->FnTable.RdrResourcesRemove == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_L, "Function Pointer is NULL, no user function to call");
        return;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "Calling RdrResourcesRemove function pointer");
    SaErrorT rc = Record->FnTable.RdrResourcesRemove(DomainId, ResourceId, &Record->Rdr,
                                                     Record->UserDefined, &Record->FnTable);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "User Cleanup returned %d for resource %d, record %d", rc,
                 ResourceId, Record->Rdr.RecordId);
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsRdrGetNodeFromLinkedList(KviCsLinkedListT *ListIn, SaHpiEntryIdT EntryId,
                                                  KviCsLinkedListNodeT **Node) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ListIn);
    KVI_NULL_CHECK(Node);
    *Node = kviHashListFind(ListIn, EntryId, kviRdrRecordIdOf);
    return *Node != nullptr ? SA_OK : SA_ERR_HPI_NOT_PRESENT;
}

KVI_EXPORT SaErrorT kviCsRdrGetRdrContainer(KviCsRdrRepositoryContainerT *RdrRepositoryContainer,
                                            SaHpiEntryIdT EntryId,
                                            KviCsRdrContainerT **RdrContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RdrRepositoryContainer);
    KVI_NULL_CHECK(RdrContainer);
    KviCsLinkedListNodeT *node =
        kviHashFind(kviRdrTableOf(RdrRepositoryContainer), EntryId, kviRdrRecordIdOf);
    if (node == nullptr)
        return SA_ERR_HPI_NOT_PRESENT;
    *RdrContainer = static_cast<KviCsRdrContainerT *>(node->Data);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRdrGetNextEntry(KviCsRdrRepositoryContainerT *RdrContainerToSearch,
                                         SaHpiEntryIdT CurrentEntry,
                                         SaHpiEntryIdT *NextEntryId) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RdrContainerToSearch);
    KVI_NULL_CHECK(NextEntryId);
    if (CurrentEntry == SAHPI_LAST_ENTRY) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value for CurrentEntry (%#x)", CurrentEntry);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviCsLinkedListNodeT *next = nullptr;
    SaErrorT rc =
        kviHashWalkNext(kviRdrTableOf(RdrContainerToSearch), CurrentEntry, kviRdrRecordIdOf, &next);
    if (rc == SA_OK)
        *NextEntryId = next != nullptr ? kviRdrRecordIdOf(next) : SAHPI_LAST_ENTRY;
    return rc;
}

KVI_EXPORT SaErrorT kviCsRdrGivenRepositoryRemoveEntry(
    SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
    KviCsRdrRepositoryContainerT *RdrRepositoryContainer, SaHpiEntryIdT EntryId) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RdrRepositoryContainer);
    if (EntryId == SAHPI_LAST_ENTRY) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "EntryId can't be SAHPI_LAST_ENTRY");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviHashTable table = kviRdrTableOf(RdrRepositoryContainer);
    KviCsLinkedListNodeT *node = nullptr;
    if (EntryId == SAHPI_FIRST_ENTRY)
        node = kviHashFirstFrom(table, 0);
    else
        node = kviHashFind(table, EntryId, kviRdrRecordIdOf);
    if (node == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_H, "Request to remove entry %d, but can't find that entry", EntryId);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    if (kviCsLinkedListRemoveNode(node) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't remove Node %#8.8x from linked list",
                 addressOf(node));
        return SA_ERR_HPI_ERROR;
    }
    auto *record = static_cast<KviCsRdrContainerT *>(node->Data);
    callCleanup(DomainId, ResourceId, record);
    KVI_CS_FREE(record);
    kviCsLinkedListNodeFree(node);
    return SA_OK;
}

} // extern "C"
