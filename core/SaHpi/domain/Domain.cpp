// The one domain the daemon serves. Its table and hash lists are static:
// they live from the first saHpiInitialize to the end of the process and
// survive finalize/initialize cycles.
#include <atomic>
#include <cstdlib>

#include "core/SaHpi/domain/Domain.h"
#include "core/utils/KviTrace.h"

namespace
{
KviCsRptContainerT MyRptContainer;
KviCsLinkedListT MyRptEntries[KVI_CS_DEFAULT_RPT_HASH_SIZE];
SaHpiBoolT FirstTime = SAHPI_TRUE;
// Read by plug-in threads as FRUs are inserted, written by client calls.
std::atomic<SaHpiTimeoutT> AutoInsertTimeout{KVI_CS_DEFAULT_AUTO_INSERT_TIMEOUT};

SaErrorT defaultDomainOnly(SaHpiDomainIdT DomainId) noexcept
{
    if (DomainId == SAHPI_DEFAULT_DOMAIN_ID)
        return SA_OK;
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Domain Id: %d", DomainId);
    return SA_ERR_HPI_INVALID_DOMAIN;
}

// A domain without its lock or lists cannot serve anything; end here rather
// than fail every later call.
void setUpTableOrExit()
{
    if (KVI_CS_SEM_INIT(&MyRptContainer.Semaphore, 1) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Failed to initialize semaphore.");
        exit(1);
    }
    MyRptContainer.RptEntryList = MyRptEntries;
    for (KviCsLinkedListT &list : MyRptEntries) {
        if (kviCsLinkedListInitialize(&list) != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_FATAL, "Failed to initialize LinkedList.");
            exit(1);
        }
    }
    MyRptContainer.HashSize = KVI_CS_DEFAULT_RPT_HASH_SIZE;
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsDomainInitialize(void) noexcept
{
    KVI_TRACE("");
    if (!FirstTime) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Duplicate call!");
        return SA_ERR_HPI_DUPLICATE;
    }
    FirstTime = SAHPI_FALSE;
    MyRptContainer.LastResourceId = 1;
    MyRptContainer.RptInfo.UpdateCount = 0;
    MyRptContainer.RptInfo.UpdateTimestamp = SAHPI_TIME_UNSPECIFIED;
    setUpTableOrExit();
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsGetRptContainerByDomainId(SaHpiDomainIdT DomainId,
                                                   KviCsRptContainerT **RptContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RptContainer);
    if (DomainId != SAHPI_DEFAULT_DOMAIN_ID) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Domain Id: %d", DomainId);
        return SA_ERR_HPI_INVALID_DOMAIN;
    }
    if (FirstTime) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Call made to get container before initialization.");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    *RptContainer = &MyRptContainer;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsGetDomainList(SaHpiUint32T ListSize, SaHpiDomainIdT *DomainList,
                                       SaHpiUint32T *NumDomains) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(DomainList);
    KVI_NULL_CHECK(NumDomains);
    *NumDomains = 1;
    if (ListSize < 1) {
        KVI_DLOG(KVI_LOG_DBG_L, "ListSize is too small %d<%d", ListSize, 1);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    DomainList[0] = SAHPI_DEFAULT_DOMAIN_ID;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsAutoInsertTimeoutGet(SaHpiDomainIdT DomainId,
                                              SaHpiTimeoutT *Timeout) noexcept
{
    KVI_TRACE("domain=%u", DomainId);
    KVI_NULL_CHECK(Timeout);
    const SaErrorT rc = defaultDomainOnly(DomainId);
    if (rc == SA_OK)
        *Timeout = AutoInsertTimeout.load();
    return rc;
}

} // extern "C"

SaErrorT kviCsAutoInsertTimeoutSet(SaHpiDomainIdT DomainId, SaHpiTimeoutT Timeout) noexcept
{
    KVI_TRACE("domain=%u, timeout=%lld", DomainId, static_cast<long long>(Timeout));
    if (!kviCsTimeoutIsValid(Timeout)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid timeout %lld", static_cast<long long>(Timeout));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    const SaErrorT rc = defaultDomainOnly(DomainId);
    if (rc == SA_OK)
        AutoInsertTimeout.store(Timeout);
    return rc;
}
