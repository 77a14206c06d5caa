// Helpers of the resource presence table that run with its lock held, the
// lock itself, and the walk shared with the RDR repositories.
#include "core/SaHpi/rpt/RptHelpers.h"

#include <cstdlib>

#include "kvi/KviDomain.h"
#include "kvi/KviTime.h"

namespace
{
// The RPT lock waits this long (milliseconds) before it reports busy.
constexpr SaHpiUint32T RPT_LOCK_TIMEOUT = 5000;
// Candidates the id generator tries before it gives up: every 32-bit id.
constexpr SaHpiUint32T MAX_ID_ATTEMPTS = 0xFFFFFFFF;

SaHpiUint32T resourceIdOf(const KviCsLinkedListNodeT *Node)
{
    return static_cast<const KviCsRptEntryContainerT *>(Node->Data)->RptEntry.ResourceId;
}

KviHashTable tableOf(const KviCsRptContainerT *RptContainer)
{
    return KviHashTable{RptContainer->RptEntryList, RptContainer->HashSize};
}

// Ids that can never name a resource: the generator skips them after a wrap.
bool unusableId(SaHpiResourceIdT Id)
{
    return Id == SAHPI_FIRST_ENTRY || Id == SAHPI_UNSPECIFIED_RESOURCE_ID;
}

// Gives back what an unlinked entry holds: its records first, then whatever
// the plug-in hung on it, then the entry itself. False if anything failed.
bool releaseEntry(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, KviCsLinkedListNodeT *Node)
{
    bool clean = true;
    auto *entry = static_cast<KviCsRptEntryContainerT *>(Node->Data);
    if (kviCsRdrRepositoryRemove(DomainId, ResourceId, &entry->RdrRepositoryContainer) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Couldn't remove the RDR Repository.  Continuing To remove "
                                       "the Rdr.  Expect a memory leak.");
        clean = false;
    }
    if (entry->FnTable.RptEntryResourcesRemove != nullptr) {
        SaErrorT rc = entry->FnTable.RptEntryResourcesRemove(DomainId, ResourceId, &entry->RptEntry,
                                                             entry->UserDefined, entry->Active,
                                                             &entry->FnTable);
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "RptEntryResourcesRemove failed with rc=%d; continuing",
                     rc);
            clean = false;
        }
    }
    bool freed = KVI_CS_FREE(entry) == SA_OK;
    freed = kviCsLinkedListNodeFree(Node) == SA_OK && freed;
    if (!freed) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Unable to free the node's memory. This will probably cause a memory leak");
        clean = false;
    }
    return clean;
}
} // namespace

SaErrorT kviHashWalkNext(KviHashTable Table, SaHpiEntryIdT Current, KviHashKeyOf KeyOf,
                         KviCsLinkedListNodeT **Next) noexcept
{
    if (Current == SAHPI_FIRST_ENTRY) {
        *Next = kviHashFirstFrom(Table, 0);
        if (*Next != nullptr)
            return SA_OK;
        KVI_DLOG(KVI_LOG_DBG_H, "No entries found.");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    if (!Table.usable() || Table.listOf(Current)->HeadPointer == nullptr) {
        KVI_WLOG(KVI_LOG_WARN, "No entries in the list where CurrentEntry should exist.");
        return SA_ERR_HPI_NOT_PRESENT;
    }
    KviCsLinkedListNodeT *node = kviHashListFind(Table.listOf(Current), Current, KeyOf);
    if (node == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_H, "Didn't find our record in the list");
        return SA_ERR_HPI_NOT_PRESENT;
    }
    *Next = node->Next != nullptr ? node->Next : kviHashFirstFrom(Table, Current % Table.Size + 1);
    return SA_OK;
}

extern "C" {

KVI_EXPORT SaErrorT kviCsRptGenerateResourceId(KviCsRptContainerT *RptContainer,
                                               SaHpiResourceIdT *ResourceId) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    KVI_NULL_CHECK(ResourceId);
    for (SaHpiUint32T attempts = 1;; ++attempts) {
        if (attempts == MAX_ID_ATTEMPTS) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                     "Tried all resourceId's, and all are in use.  This is theoretically "
                     "impossible if this is a 32-bit machine and highly improbable on any other "
                     "machine.  Something's probably broke.");
            return SA_ERR_HPI_ERROR;
        }
        SaHpiResourceIdT candidate = RptContainer->LastResourceId++;
        KviCsLinkedListNodeT *node = nullptr;
        SaErrorT rc = kviCsRptGetNode(RptContainer, candidate, &node);
        if (rc == SA_OK || (rc == SA_ERR_HPI_INVALID_RESOURCE && unusableId(candidate)))
            continue;
        if (rc != SA_ERR_HPI_INVALID_RESOURCE) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRptGetNode failed.");
            return SA_ERR_HPI_ERROR;
        }
        *ResourceId = candidate;
        KVI_DLOG(KVI_LOG_DBG_L, "*ResourceId: %d", *ResourceId);
        return SA_OK;
    }
}

KVI_EXPORT SaErrorT kviCsRptGetNextEntry(KviCsRptContainerT *RptContainerToSearch,
                                         SaHpiEntryIdT CurrentEntry, SaHpiEntryIdT *NextEntry,
                                         SaHpiBoolT *Active) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainerToSearch);
    KVI_NULL_CHECK(NextEntry);
    KVI_NULL_CHECK(Active);
    if (CurrentEntry == SAHPI_LAST_ENTRY) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value for CurrentEntry (%#x)", CurrentEntry);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviCsLinkedListNodeT *next = nullptr;
    SaErrorT rc = kviHashWalkNext(tableOf(RptContainerToSearch), CurrentEntry, resourceIdOf, &next);
    if (rc != SA_OK)
        return rc;
    if (next == nullptr) {
        *NextEntry = SAHPI_LAST_ENTRY;
        *Active = SAHPI_TRUE;
        return SA_OK;
    }
    auto *entry = static_cast<KviCsRptEntryContainerT *>(next->Data);
    *NextEntry = entry->RptEntry.ResourceId;
    *Active = entry->Active;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptGetNodeFromLinkedList(KviCsLinkedListT *ListIn,
                                                  SaHpiResourceIdT ResourceId,
                                                  KviCsLinkedListNodeT **Node) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ListIn);
    KVI_NULL_CHECK(Node);
    *Node = kviHashListFind(ListIn, ResourceId, resourceIdOf);
    return *Node != nullptr ? SA_OK : SA_ERR_HPI_NOT_PRESENT;
}

// Not finding the id is SA_ERR_HPI_INVALID_RESOURCE here: the id generator
// tells a free id from a broken lookup by it.
KVI_EXPORT SaErrorT kviCsRptGetNode(KviCsRptContainerT *RptContainer, SaHpiResourceIdT ResourceId,
                                    KviCsLinkedListNodeT **Node) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    KVI_NULL_CHECK(Node);
    KviHashTable table = tableOf(RptContainer);
    if (!table.usable())
        return SA_ERR_HPI_ERROR;
    SaErrorT rc = kviCsRptGetNodeFromLinkedList(table.listOf(ResourceId), ResourceId, Node);
    return rc == SA_ERR_HPI_NOT_PRESENT ? SA_ERR_HPI_INVALID_RESOURCE : rc;
}

KVI_EXPORT SaErrorT
kviCsRptGetRptEntryContainer(KviCsRptContainerT *RptContainer, SaHpiResourceIdT ResourceId,
                             KviCsRptEntryContainerT **RptEntryContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    KVI_NULL_CHECK(RptEntryContainer);
    KviCsLinkedListNodeT *node = nullptr;
    SaErrorT rc = kviCsRptGetNode(RptContainer, ResourceId, &node);
    if (rc != SA_OK)
        return rc == SA_ERR_HPI_INVALID_RESOURCE ? SA_ERR_HPI_NOT_PRESENT : rc;
    *RptEntryContainer = static_cast<KviCsRptEntryContainerT *>(node->Data);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptEntryRemoveByRidNoLock(SaHpiDomainIdT DomainId,
                                                   SaHpiResourceIdT ResourceId,
                                                   KviCsRptContainerT *RptContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    KviHashTable table = tableOf(RptContainer);
    KviCsLinkedListNodeT *node = nullptr;
    SaErrorT rc = table.usable()
                      ? kviCsRptGetNodeFromLinkedList(table.listOf(ResourceId), ResourceId, &node)
                      : SA_ERR_HPI_ERROR;
    if (rc != SA_OK)
        return rc == SA_ERR_HPI_NOT_PRESENT ? SA_ERR_HPI_NOT_PRESENT : SA_ERR_HPI_ERROR;
    if (kviCsLinkedListRemoveNode(node) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to remove node from linked list.  We may be "
                                    "leavingthe RPT in a very bad state.");
        return SA_ERR_HPI_ERROR;
    }
    bool clean = releaseEntry(DomainId, ResourceId, node);
    kviCsRptUpdateInfo(&RptContainer->RptInfo);
    if (!clean) {
        trace.exitMessage("errorsFound");
        return SA_ERR_HPI_UNKNOWN;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptUpdateInfo(SaHpiRptInfoT *RptInfo) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptInfo);
    RptInfo->UpdateCount++;
    if (kviCsGetSaHpiTime(&RptInfo->UpdateTimestamp) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsGetSaHpiTime failed");
        RptInfo->UpdateTimestamp = SAHPI_TIME_UNSPECIFIED;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRptLockRpt(SaHpiDomainIdT DomainId,
                                    KviCsRptContainerT **RptContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    KviCsRptContainerT *rpt = nullptr;
    SaErrorT rc = kviCsGetRptContainerByDomainId(DomainId, &rpt);
    if (rc == SA_ERR_HPI_INVALID_DOMAIN) {
        KVI_DLOG(KVI_LOG_DBG_H, "Unable to get the rpt container, returned %d", rc);
        return rc;
    }
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to get the rpt container, returned %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = KVI_CS_SEM_WAIT(&rpt->Semaphore, RPT_LOCK_TIMEOUT);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to wait on semaphore, returned %d", rc);
        return SA_ERR_HPI_BUSY;
    }
    *RptContainer = rpt;
    return SA_OK;
}

// The release checks that the lock is really held: a table unlocked twice
// may already have been changed under a second writer, so the process ends.
KVI_EXPORT void kviCsRptUnlockRpt(KviCsRptContainerT *RptContainer) noexcept
{
    KVI_TRACE("");
    if (RptContainer == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "RptContainer pointer is NULL.");
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Can't unlock RPT.  Bailing.");
        exit(1);
    }
    SaErrorT rc = KVI_CS_SEM_TRYWAIT(&RptContainer->Semaphore);
    if (rc == SA_ERR_HPI_BUSY) {
        KVI_CS_DOA_SEM_POST(&RptContainer->Semaphore);
        return;
    }
    if (rc == SA_OK)
        KVI_ELOG(KVI_LOG_ERR_FATAL,
                 "Tried to unlock RPT twice.  The source code is broken.  Bailing.");
    else
        KVI_ELOG(KVI_LOG_ERR_FATAL, "KVI_CS_SEM_TRYWAIT returned %d.  Bailing.", rc);
    exit(1);
}

} // extern "C"
