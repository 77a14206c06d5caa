// The HPI front end: the exported entry points that the daemon calls for its
// clients.
#include "core/utils/KviTrace.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMemory.h"

extern "C" {

// Ready-made removal slots for plug-ins whose user data is one block taken
// with the library's allocator: the block goes back the same way.
KVI_EXPORT SaErrorT kviDsDefaultRdrResourcesRemove(SaHpiDomainIdT DomainId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiRdrT *RdrEntry, void *UserDefined,
                                                   KviDsRdrFnTable *FnTable) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    if (UserDefined != nullptr)
        KVI_CS_FREE(UserDefined);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviDsDefaultRptResourcesRemove(SaHpiDomainIdT DomainId,
                                                   SaHpiResourceIdT ResourceId,
                                                   SaHpiRptEntryT *RptEntry, void *UserDefined,
                                                   SaHpiBoolT Active,
                                                   KviDsRptFnTable *FnTable) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, Active=%d", DomainId, ResourceId, Active);
    if (UserDefined != nullptr)
        KVI_CS_FREE(UserDefined);
    return SA_OK;
}

} // extern "C"
