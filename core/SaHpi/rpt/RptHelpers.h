// Shapes shared by the RPT and the RDR repositories: both are arrays of
// linked lists indexed by id modulo their size, walked list by list in
// increasing number and within a list in order of addition. Clients see that
// order, so it is written once here. Also the scoped hold of the RPT lock.
#pragma once

#include <cstring>

#include "core/utils/KviTrace.h"
#include "kvi/KviRpt.h"

// The number stored in an enum field of a caller's structure, read without
// assuming it is one of the enum's values: a C caller may store any int.
template <typename Enum> SaHpiUint32T kviRawEnum(const Enum &Field) noexcept
{
    static_assert(sizeof(Enum) == sizeof(SaHpiUint32T));
    SaHpiUint32T raw;
    memcpy(&raw, &Field, sizeof raw);
    return raw;
}

// The id under which a node's record is filed: the resource id of an RPT
// node, the record id of an RDR node.
using KviHashKeyOf = SaHpiUint32T (*)(const KviCsLinkedListNodeT *Node);

// The hash lists of one table.
struct KviHashTable {
    KviCsLinkedListT *Lists;
    SaHpiUint32T Size;

    bool usable() const noexcept { return Lists != nullptr && Size != 0; }
    KviCsLinkedListT *listOf(SaHpiUint32T Id) const noexcept { return &Lists[Id % Size]; }
};

// The node filed under Id in one list, or null.
inline KviCsLinkedListNodeT *kviHashListFind(const KviCsLinkedListT *List, SaHpiUint32T Id,
                                             KviHashKeyOf KeyOf) noexcept
{
    for (KviCsLinkedListNodeT *node = List->HeadPointer; node != nullptr; node = node->Next) {
        if (KeyOf(node) == Id)
            return node;
    }
    return nullptr;
}

// The node filed under Id, or null.
inline KviCsLinkedListNodeT *kviHashFind(KviHashTable Table, SaHpiUint32T Id,
                                         KviHashKeyOf KeyOf) noexcept
{
    return Table.usable() ? kviHashListFind(Table.listOf(Id), Id, KeyOf) : nullptr;
}

// The head of the first non-empty list numbered From or higher, or null.
inline KviCsLinkedListNodeT *kviHashFirstFrom(KviHashTable Table, SaHpiUint32T From) noexcept
{
    for (SaHpiUint32T i = From; Table.usable() && i < Table.Size; ++i) {
        if (Table.Lists[i].HeadPointer != nullptr)
            return Table.Lists[i].HeadPointer;
    }
    return nullptr;
}

// One step of the walk. From SAHPI_FIRST_ENTRY: the first node
// (SA_ERR_HPI_INVALID_REQUEST when the table is empty). From an entry: its
// successor in its list, else the head of the next non-empty list, else
// null for the end (SA_OK). An entry that is not filed: SA_ERR_HPI_NOT_PRESENT.
SaErrorT kviHashWalkNext(KviHashTable Table, SaHpiEntryIdT Current, KviHashKeyOf KeyOf,
                         KviCsLinkedListNodeT **Next) noexcept;

// Holds the RPT lock of a domain from construction until release() or the
// end of the scope; the release checks that the lock really was held.
class KviRptLock
{
  public:
    explicit KviRptLock(SaHpiDomainIdT DomainId) noexcept : rc_(kviCsRptLockRpt(DomainId, &rpt_)) {}
    ~KviRptLock() { release(); }
    KviRptLock(const KviRptLock &) = delete;
    KviRptLock &operator=(const KviRptLock &) = delete;

    SaErrorT result() const noexcept { return rc_; }
    bool held() const noexcept { return rc_ == SA_OK; }
    KviCsRptContainerT *rpt() const noexcept { return rpt_; }
    void release() noexcept
    {
        if (!held())
            return;
        rc_ = SA_ERR_HPI_INVALID_REQUEST;
        kviCsRptUnlockRpt(rpt_);
    }

  private:
    KviCsRptContainerT *rpt_ = nullptr;
    SaErrorT rc_;
};
