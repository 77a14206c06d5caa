// How a repository's records are filed, for the two units of the RDR store.
#pragma once

#include "core/SaHpi/rpt/RptHelpers.h"
#include "kvi/KviRdr.h"

inline SaHpiUint32T kviRdrRecordIdOf(const KviCsLinkedListNodeT *Node) noexcept
{
    return static_cast<const KviCsRdrContainerT *>(Node->Data)->Rdr.RecordId;
}

inline KviHashTable kviRdrTableOf(const KviCsRdrRepositoryContainerT *Repository) noexcept
{
    return KviHashTable{Repository->RdrList, Repository->HashSize};
}
