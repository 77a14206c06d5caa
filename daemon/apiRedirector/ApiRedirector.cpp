// The HPI front end: the exported entry points that the daemon calls for its
// clients.
#include <cstdlib>
#include <initializer_list>

#include "core/SaHpi/events/EventManager.h"
#include "core/utils/KviTrace.h"
#include "kvi/KviApiRedirector.h"
#include "kvi/KviDomain.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMaplManager.h"
#include "kvi/KviMemory.h"
#include "kvi/KviNonVolatile.h"
#include "kvi/KviRdr.h"
#include "kvi/KviRpt.h"
#include "kvi/KviSession.h"

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

// ---- Library lifecycle and the call gate ----
//
// isInitializedLock is held for reading by every gated call for its whole
// length and for writing by saHpiInitialize and saHpiFinalize. So finalize
// waits for the running calls to drain, and a call that arrives meanwhile
// gives up after API_TIMEOUT with SA_ERR_HPI_NO_RESPONSE.

namespace
{

constexpr SaHpiUint32T API_TIMEOUT = 500;
constexpr SaHpiUint32T INIT_TIMEOUT = 10000;
constexpr SaHpiVersionT IMPLEMENTATION_VERSION = 1;

SaHpiBoolT isInitialized = SAHPI_FALSE;
// The domain, RPT, RDR and session tables are set up by the first successful
// saHpiInitialize only: they survive finalize and are used again.
SaHpiBoolT atLeastOneInitialize = SAHPI_FALSE;
KviCsRwLockT isInitializedLock;
KviCsRwLockT *maplMasterLock = nullptr;

// A line attributed to the function that made the guard.
#define KVI_API_SITE_LOG(Site, Level, ...)                                                         \
    kviCsLogger((Site).file, static_cast<SaHpiInt16T>((Site).line), (Site).func, (Level),          \
                __VA_ARGS__)

// isInitializedLock for reading or writing until release() or the end of the
// scope. A time-out is the client's answer; any other fault of the lock layer
// is not survivable.
template <bool Write> class KviInitializedLock
{
  public:
    explicit KviInitializedLock(const KviCallSite &Site) noexcept : site_(Site) {}
    ~KviInitializedLock() { release(); }
    KviInitializedLock(const KviInitializedLock &) = delete;
    KviInitializedLock &operator=(const KviInitializedLock &) = delete;

    SaErrorT acquire() noexcept
    {
        const SaErrorT rc = Write ? kviCsRwLockWrLock(site_.file, site_.func, site_.line,
                                                      &isInitializedLock, INIT_TIMEOUT)
                                  : kviCsRwLockRdLock(site_.file, site_.func, site_.line,
                                                      &isInitializedLock, API_TIMEOUT);
        if (rc == SA_ERR_HPI_TIMEOUT) {
            KVI_API_SITE_LOG(site_, KVI_LOG_WARN_NUM, "Timeout waiting for isInitialized.");
            return SA_ERR_HPI_NO_RESPONSE;
        }
        if (rc != SA_OK) {
            KVI_API_SITE_LOG(site_, KVI_LOG_ERR_FATAL_NUM,
                             Write ? "KVI_CS_RW_LOCK_WR_LOCK failed. rc=%d"
                                   : "KVI_CS_RW_LOCK_RD_LOCK failed. rc=%d",
                             rc);
            exit(1);
        }
        held_ = true;
        return SA_OK;
    }

    void release() noexcept
    {
        if (!held_)
            return;
        held_ = false;
        const SaErrorT rc =
            Write ? kviCsRwLockWrUnlock(site_.file, site_.func, site_.line, &isInitializedLock)
                  : kviCsRwLockRdUnlock(site_.file, site_.func, site_.line, &isInitializedLock);
        if (rc != SA_OK) {
            KVI_API_SITE_LOG(site_, KVI_LOG_ERR_FATAL_NUM, "KVI_CS_RW_LOCK_UNLOCK failed. rc=%d",
                             rc);
            exit(1);
        }
    }

  private:
    KviCallSite site_;
    bool held_ = false;
};

// The gate that every saHpi* call passes: the library must be initialized
// and, for calls that take one, the session must be open.
class KviApiGate
{
  public:
    explicit KviApiGate(const KviCallSite &Site) noexcept : site_(Site), lock_(Site) {}

    SaErrorT enter() noexcept
    {
        const SaErrorT rc = lock_.acquire();
        if (rc != SA_OK)
            return rc;
        if (isInitialized != SAHPI_TRUE) {
            KVI_API_SITE_LOG(site_, KVI_LOG_DBG_H_NUM,
                             "SaHpi APIs may not be called before saHpiInitialize.");
            return leave(SA_ERR_HPI_UNINITIALIZED);
        }
        return SA_OK;
    }

    SaErrorT enter(SaHpiSessionIdT SessionId) noexcept
    {
        SaErrorT rc = enter();
        if (rc != SA_OK)
            return rc;
        rc = kviCsSessionValidate(SessionId);
        if (rc == SA_ERR_HPI_INVALID_SESSION) {
            KVI_API_SITE_LOG(site_, KVI_LOG_DBG_H_NUM,
                             "kviCsSessionValidate failed. Invalid session %u", SessionId);
            return leave(SA_ERR_HPI_INVALID_SESSION);
        }
        if (rc != SA_OK) {
            KVI_API_SITE_LOG(site_, KVI_LOG_ERR_NONFATAL_NUM,
                             "kviCsSessionValidate failed. rc=%d, sess=%u.", rc, SessionId);
            return leave(SA_ERR_HPI_ERROR);
        }
        return SA_OK;
    }

    SaErrorT leave(SaErrorT Rc) noexcept
    {
        lock_.release();
        return Rc;
    }

  private:
    KviCallSite site_;
    KviInitializedLock<false> lock_;
};

// Opens the gate for the rest of the calling function, with the session to
// validate or none; a refused gate returns its code at once.
#define REDIR_API_BEGIN_BLOCK(...)                                                                 \
    KviApiGate apiGate(KVI_CALL_SITE("&isInitializedLock"));                                       \
    do {                                                                                           \
        const SaErrorT gateRc_ = apiGate.enter(__VA_ARGS__);                                       \
        if (gateRc_ != SA_OK)                                                                      \
            return gateRc_;                                                                        \
    } while (0)
// Leaves through the gate: the read lock goes before the exit line is written.
#define REDIR_API_END_BLOCK(Rc) return apiGate.leave(Rc)

// Rc when it is one of the codes a call passes on to its client, otherwise
// the generic failure.
SaErrorT passOrError(SaErrorT Rc, std::initializer_list<SaErrorT> Passed) noexcept
{
    for (SaErrorT passed : Passed)
        if (Rc == passed)
            return Rc;
    return SA_ERR_HPI_ERROR;
}

// The event queue is set up on every initialize and torn down on every
// finalize; these two are the only places where that happens.
SaErrorT eventQueueInitialize() noexcept
{
    return kviCsEventQueueInitialize();
}
SaErrorT eventQueueFinalize() noexcept
{
    return kviCsEventQueueFinalize();
}

using KviLifecycleFn = SaErrorT (*)() noexcept;

// One announced step of initialize or finalize; the failure line names the
// step in the words the daemon's operators know.
SaErrorT runStep(const char *Name, KviLifecycleFn Run, const char *FailureName) noexcept
{
    KVI_DLOG(KVI_LOG_DBG_L, "Calling %s()", Name);
    const SaErrorT rc = Run();
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_FATAL, "%s failed. rc=%d", FailureName, rc);
    return rc;
}

struct KviInitStep {
    const char *name;
    KviLifecycleFn run;
    bool firstTimeOnly;
    const char *failureName;
};

// In this order. The session table's failure is reported in the RDR
// initializer's words, as it always has been.
const KviInitStep initSteps[] = {
    {"kviCsNonVolatileInitialize", kviCsNonVolatileInitialize, false, "kviCsNonVolatileInitialize"},
    {"kviCsDomainInitialize", kviCsDomainInitialize, true, "kviCsDomainInitialize"},
    {"kviCsRptInitialize", kviCsRptInitialize, true, "kviCsRptInitialize"},
    {"kviCsRdrInitialize", kviCsRdrInitialize, true, "kviCsRdrInitialize"},
    {"kviCsSessionInitialize", kviCsSessionInitialize, true, "kviCsRdrInitialize"},
    {"kviCsEventQueueInitialize", eventQueueInitialize, false, "kviCsEventQueueInitialize"},
    {"kviDsMaplManagerLoadMapls", kviDsMaplManagerLoadMapls, false, "kviDsMaplManagerLoadMapls"},
};

// Stops at the first failure; what already ran stays as it is, and the next
// saHpiInitialize runs the sequence again.
SaErrorT runInitializers() noexcept
{
    for (const KviInitStep &step : initSteps) {
        if (step.firstTimeOnly && atLeastOneInitialize == SAHPI_TRUE)
            continue;
        const SaErrorT rc = runStep(step.name, step.run, step.failureName);
        if (rc != SA_OK)
            return rc;
    }
    return SA_OK;
}

} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviDsApiRedirectorInitialize(void) noexcept
{
    KVI_TRACE("");
    SaErrorT rc = KVI_CS_RW_LOCK_INIT(&isInitializedLock);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to initialize isInitializedLock. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = kviDsMaplManagerInitialize();
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "kviDsMaplManagerInitialize failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = kviDsMaplManagerGetMaplMasterLock(&maplMasterLock);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "kviDsMaplManagerGetMaplMasterLock failed.rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT saHpiInitialize(SaHpiVersionT *HpiImplVersion) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(HpiImplVersion);
    KviInitializedLock<true> exclusive(KVI_CALL_SITE("&isInitializedLock"));
    const SaErrorT locked = exclusive.acquire();
    if (locked != SA_OK)
        return locked;
    if (isInitialized == SAHPI_TRUE) {
        KVI_WLOG(KVI_LOG_WARN, "Duplicate call to saHpiInitialize.");
        return SA_ERR_HPI_DUPLICATE;
    }
    if (runInitializers() != SA_OK)
        return SA_ERR_HPI_ERROR;
    *HpiImplVersion = IMPLEMENTATION_VERSION;
    isInitialized = SAHPI_TRUE;
    atLeastOneInitialize = SAHPI_TRUE;
    return SA_OK;
}

KVI_EXPORT SaErrorT saHpiFinalize(void) noexcept
{
    KVI_TRACE("");
    KviInitializedLock<true> exclusive(KVI_CALL_SITE("&isInitializedLock"));
    const SaErrorT locked = exclusive.acquire();
    if (locked != SA_OK)
        return locked;
    if (isInitialized != SAHPI_TRUE) {
        KVI_DLOG(KVI_LOG_DBG_H, "Cannot call saHpiFinalize before saHpiInitialize.");
        return SA_ERR_HPI_UNINITIALIZED;
    }
    // Waits, lock by lock, for the calls still running in each plug-in.
    const SaErrorT rc = kviDsMaplManagerUnloadAllMapls();
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviDsMaplManagerUnloadAllMapls failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    if (runStep("kviCsEventQueueFinalize", eventQueueFinalize, "kviCsEventQueueFinalize") != SA_OK)
        return SA_ERR_HPI_ERROR;
    if (kviCsCloseAllSessions() != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsCloseAllSessions failed!");
    if (runStep("kviCsNonVolatileFinalize", kviCsNonVolatileFinalize, "kviCsNonVolatileFinalize") !=
        SA_OK)
        return SA_ERR_HPI_ERROR;
    isInitialized = SAHPI_FALSE;
    return SA_OK;
}

KVI_EXPORT SaErrorT saHpiSessionOpen(SaHpiDomainIdT DomainId, SaHpiSessionIdT *SessionId,
                                     void *SecurityParams) noexcept
{
    KVI_TRACE("domain=%u", DomainId);
    KVI_NULL_CHECK(SessionId);
    REDIR_API_BEGIN_BLOCK();
    const SaErrorT rc = kviCsSessionOpen(DomainId, SessionId);
    KVI_DLOG(KVI_LOG_DBG_L, "kviCsSessionOpen returned %d", rc);
    REDIR_API_END_BLOCK(
        passOrError(rc, {SA_OK, SA_ERR_HPI_DATA_EX_LIMITS, SA_ERR_HPI_INVALID_DOMAIN}));
}

KVI_EXPORT SaErrorT saHpiSessionClose(SaHpiSessionIdT SessionId) noexcept
{
    KVI_TRACE("sess=%u", SessionId);
    REDIR_API_BEGIN_BLOCK(SessionId);
    REDIR_API_END_BLOCK(passOrError(kviCsSessionClose(SessionId),
                                    {SA_OK, SA_ERR_HPI_BUSY, SA_ERR_HPI_INVALID_SESSION}));
}

KVI_EXPORT SaErrorT saHpiResourcesDiscover(SaHpiSessionIdT SessionId) noexcept
{
    KVI_TRACE("sess=%u", SessionId);
    REDIR_API_BEGIN_BLOCK(SessionId);
    SaHpiDomainIdT domainId = SAHPI_DEFAULT_DOMAIN_ID;
    const SaErrorT rc = kviCsGetDomainFromSession(SessionId, &domainId);
    if (rc != SA_OK)
        REDIR_API_END_BLOCK(passOrError(rc, {SA_ERR_HPI_INVALID_SESSION}));
    const SaErrorT discovered = kviDsMaplManagerDiscoverResources(domainId);
    if (discovered != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviDsMaplManagerDiscoverResources returned %d", discovered);
        REDIR_API_END_BLOCK(SA_ERR_HPI_ERROR);
    }
    REDIR_API_END_BLOCK(SA_OK);
}

} // extern "C"
