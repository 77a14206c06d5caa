// The HPI front end: the exported entry points that the daemon calls for its
// clients.
#include <cstdlib>
#include <initializer_list>
#include <type_traits>

#include "core/SaHpi/domain/Domain.h"
#include "core/SaHpi/events/EventManager.h"
#include "core/SaHpi/parmControl/ParmControlHelpers.h"
#include "core/utils/KviTrace.h"
#include "daemon/apiRedirector/ApiRedirector.h"
#include "kvi/KviApiRedirector.h"
#include "kvi/KviDomain.h"
#include "kvi/KviEntitySchema.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMaplManager.h"
#include "kvi/KviMemory.h"
#include "kvi/KviNonVolatile.h"
#include "kvi/KviParmControl.h"
#include "kvi/KviRdr.h"
#include "kvi/KviRpt.h"
#include "kvi/KviSession.h"

extern "C" {

// Ready-made removal slots for plug-ins whose user data is one block taken
// with the library's allocator: the block goes back the same way.
KVI_EXPORT SaErrorT kviDsDefaultRdrResourcesRemove(SaHpiDomainIdT DomainId,
                                                   SaHpiResourceIdT ResourceId, SaHpiRdrT *RdrEntry,
                                                   void *UserDefined,
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

// What a client is told when one of the front end's locks does not come, and
// what ends the process when one cannot be given back.
struct KviApiLockTexts {
    const char *timedOut;     // a time-out or a busy lock: SA_ERR_HPI_NO_RESPONSE
    const char *failed;       // any other fault of the lock layer
    bool failureIsFatal;      // ... ends the process instead of SA_ERR_HPI_ERROR
    const char *unlockFailed; // always ends the process
};

constexpr KviApiLockTexts INITIALIZED_READ_TEXTS{"Timeout waiting for isInitialized.",
                                                 "KVI_CS_RW_LOCK_RD_LOCK failed. rc=%d", true,
                                                 "KVI_CS_RW_LOCK_UNLOCK failed. rc=%d"};
constexpr KviApiLockTexts INITIALIZED_WRITE_TEXTS{"Timeout waiting for isInitialized.",
                                                  "KVI_CS_RW_LOCK_WR_LOCK failed. rc=%d", true,
                                                  "KVI_CS_RW_LOCK_UNLOCK failed. rc=%d"};
constexpr KviApiLockTexts MASTER_LOCK_TEXTS{"Unable to acquire MaplMasterLock",
                                            "KVI_CS_RW_LOCK_TRY_RD_LOCK failed for MaplMasterLock",
                                            false, "Unable to unlock MaplMasterLock"};
constexpr KviApiLockTexts MAPL_LOCK_TEXTS{"Unable to acquire Mapl Lock",
                                          "KVI_CS_RW_LOCK_TRY_RD_LOCK failed for Mapl Lock", false,
                                          "Unable to unlock Mapl Lock"};

// One of the front end's reader/writer locks, held from acquire() until
// release() or the end of the scope.
template <bool Write> class KviApiLock
{
  public:
    KviApiLock(const KviCallSite &Site, const KviApiLockTexts &Texts) noexcept
        : site_(Site), texts_(Texts)
    {
    }
    ~KviApiLock() { release(); }
    KviApiLock(const KviApiLock &) = delete;
    KviApiLock &operator=(const KviApiLock &) = delete;

    SaErrorT acquire(KviCsRwLockT *Lock, SaHpiUint32T Timeout) noexcept
    {
        const SaErrorT rc =
            Write ? kviCsRwLockWrLock(site_.file, site_.func, site_.line, Lock, Timeout)
                  : kviCsRwLockRdLock(site_.file, site_.func, site_.line, Lock, Timeout);
        if (rc == SA_ERR_HPI_TIMEOUT || rc == SA_ERR_HPI_BUSY) {
            KVI_API_SITE_LOG(site_, KVI_LOG_WARN_NUM, "%s", texts_.timedOut);
            return SA_ERR_HPI_NO_RESPONSE;
        }
        if (rc != SA_OK) {
            KVI_API_SITE_LOG(
                site_, texts_.failureIsFatal ? KVI_LOG_ERR_FATAL_NUM : KVI_LOG_ERR_NONFATAL_NUM,
                texts_.failed, rc);
            if (texts_.failureIsFatal)
                exit(1);
            return SA_ERR_HPI_ERROR;
        }
        lock_ = Lock;
        return SA_OK;
    }

    void release() noexcept
    {
        if (lock_ == nullptr)
            return;
        KviCsRwLockT *lock = lock_;
        lock_ = nullptr;
        const SaErrorT rc = Write ? kviCsRwLockWrUnlock(site_.file, site_.func, site_.line, lock)
                                  : kviCsRwLockRdUnlock(site_.file, site_.func, site_.line, lock);
        if (rc != SA_OK) {
            KVI_API_SITE_LOG(site_, KVI_LOG_ERR_FATAL_NUM, texts_.unlockFailed, rc);
            exit(1);
        }
    }

  private:
    KviCallSite site_;
    const KviApiLockTexts &texts_;
    KviCsRwLockT *lock_ = nullptr;
};

// The gate that every saHpi* call passes: the library must be initialized
// and, for calls that take one, the session must be open.
class KviApiGate
{
  public:
    explicit KviApiGate(const KviCallSite &Site) noexcept
        : site_(Site), lock_(Site, INITIALIZED_READ_TEXTS)
    {
    }

    SaErrorT enter() noexcept
    {
        const SaErrorT rc = lock_.acquire(&isInitializedLock, API_TIMEOUT);
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
    KviApiLock<false> lock_;
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
    {"kviCsEventQueueInitialize", kviCsEventQueueInitialize, false, "kviCsEventQueueInitialize"},
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
    KviApiLock<true> exclusive(KVI_CALL_SITE("&isInitializedLock"), INITIALIZED_WRITE_TEXTS);
    const SaErrorT locked = exclusive.acquire(&isInitializedLock, INIT_TIMEOUT);
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
    KviApiLock<true> exclusive(KVI_CALL_SITE("&isInitializedLock"), INITIALIZED_WRITE_TEXTS);
    const SaErrorT locked = exclusive.acquire(&isInitializedLock, INIT_TIMEOUT);
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
    if (runStep("kviCsEventQueueFinalize", kviCsEventQueueFinalize, "kviCsEventQueueFinalize") !=
        SA_OK)
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

// ---- Checks of what a client addresses and sets ----

SaErrorT getActiveRdr(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId, SaHpiUint8T MiNum,
                      SaHpiRdrTypeT RdrType, SaHpiRdrT *Rdr, SaHpiDomainIdT *DomainId,
                      void **UserData, KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                      KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, number=%u", SessionId, ResourceId, MiNum);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(DomainId);
    SaErrorT rc = kviCsGetDomainFromSession(SessionId, DomainId);
    if (rc != SA_OK)
        return passOrError(rc, {SA_ERR_HPI_INVALID_SESSION});
    using RdrGetter =
        SaErrorT (*)(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiUint8T, SaHpiRdrT *, SaHpiBoolT *,
                     void **, KviDsRdrFnTable *, SaHpiUint32T *, KviCsRwLockT **) noexcept;
    RdrGetter getter = nullptr;
    switch (kviCsRawEnum(RdrType)) {
    case SAHPI_SENSOR_RDR:
        getter = kviCsRdrGetSensor;
        break;
    case SAHPI_CTRL_RDR:
        getter = kviCsRdrGetControl;
        break;
    case SAHPI_INVENTORY_RDR:
        getter = kviCsRdrGetEir;
        break;
    case SAHPI_WATCHDOG_RDR:
        getter = kviCsRdrGetWatchdog;
        break;
    default:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unknown RDR type (%d)", kviCsRawEnum(RdrType));
        return SA_ERR_HPI_ERROR;
    }
    SaHpiBoolT active = SAHPI_FALSE;
    rc = getter(*DomainId, ResourceId, MiNum, Rdr, &active, UserData, FnTable, MaplNum, MaplLock);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "Failed to retrieve the RDR. rc=%d", rc);
        return passOrError(
            rc, {SA_ERR_HPI_INVALID_RESOURCE, SA_ERR_HPI_NOT_PRESENT, SA_ERR_HPI_INVALID_CMD});
    }
    if (active != SAHPI_TRUE) {
        KVI_DLOG(KVI_LOG_DBG_H, "RPT Entry for this RDR is not active rid=%u, number=%u",
                 ResourceId, MiNum);
        return SA_ERR_HPI_INVALID_RESOURCE;
    }
    return SA_OK;
}

namespace
{

// The four text types and the languages up to SAHPI_LANG_ZULU.
constexpr SaHpiUint32T TEXT_DATA_TYPE_COUNT = 4;
constexpr SaHpiUint32T LANGUAGE_COUNT = 137;

SaErrorT validateTextState(const SaHpiCtrlRecTextT &Rec, const SaHpiCtrlStateTextT &State) noexcept
{
    const auto dataType = kviCsRawEnum(State.Text.DataType);
    const auto language = kviCsRawEnum(State.Text.Language);
    if (dataType >= TEXT_DATA_TYPE_COUNT) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Invalid value (%d) in (&(CtrlState->StateUnion.Text.Text)).DataType.", dataType);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (language >= LANGUAGE_COUNT) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Invalid value (%d) in (&(CtrlState->StateUnion.Text.Text)).Language.", language);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (dataType != kviCsRawEnum(Rec.DataType)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid data type for text control (%d).", dataType);
        return SA_ERR_HPI_DATA_EX_LIMITS;
    }
    if (Rec.Language != SAHPI_LANG_UNDEF && kviCsRawEnum(Rec.Language) != language) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid language for text control (%d).", language);
        return SA_ERR_HPI_DATA_EX_LIMITS;
    }
    // The line number is held to the record's line count as it stands, so
    // SAHPI_TLN_ALL_LINES is refused by every control of fewer than 255 lines.
    if (State.Line > Rec.MaxLines) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid line number for text control (%d).", State.Line);
        return SA_ERR_HPI_DATA_EX_LIMITS;
    }
    if (State.Text.DataLength > Rec.MaxChars * Rec.MaxLines) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid length for text control (%d).", State.Text.DataLength);
        return SA_ERR_HPI_DATA_EX_LIMITS;
    }
    return SA_OK;
}

} // namespace

SaErrorT validateControlState(SaHpiRdrT *CtrlRdr, SaHpiCtrlStateT *CtrlState) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(CtrlState);
    if (CtrlRdr == nullptr || CtrlRdr->RdrType != SAHPI_CTRL_RDR) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "An RDR that was not a control was passed to validate control state");
        return SA_ERR_HPI_ERROR;
    }
    const SaHpiCtrlRecT &rec = CtrlRdr->RdrTypeUnion.CtrlRec;
    const auto type = kviCsRawEnum(CtrlState->Type);
    if (type != kviCsRawEnum(rec.Type)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Control state type (%d) does not match RDR (%d).", type,
                 kviCsRawEnum(rec.Type));
        return SA_ERR_HPI_INVALID_DATA;
    }
    const SaHpiCtrlStateUnionT &state = CtrlState->StateUnion;
    switch (type) {
    case SAHPI_CTRL_TYPE_DIGITAL: {
        const auto digital = kviCsRawEnum(state.Digital);
        if (digital > SAHPI_CTRL_STATE_PULSE_ON && digital != SAHPI_CTRL_STATE_AUTO) {
            KVI_DLOG(KVI_LOG_DBG_H, "Invalid digital state (%d).", digital);
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        return SA_OK;
    }
    case SAHPI_CTRL_TYPE_DISCRETE:
    case SAHPI_CTRL_TYPE_OEM:
        return SA_OK;
    case SAHPI_CTRL_TYPE_ANALOG:
        if (state.Analog < rec.TypeUnion.Analog.Min || state.Analog > rec.TypeUnion.Analog.Max) {
            KVI_DLOG(KVI_LOG_DBG_H, "Invalid analog value (%d).", state.Analog);
            return SA_ERR_HPI_DATA_EX_LIMITS;
        }
        return SA_OK;
    case SAHPI_CTRL_TYPE_STREAM:
        if (state.Stream.Repeat != SAHPI_FALSE && state.Stream.Repeat != SAHPI_TRUE) {
            KVI_DLOG(KVI_LOG_DBG_H, "Non-Bool value (%d) in CtrlState->StateUnion.Stream.Repeat.",
                     state.Stream.Repeat);
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        if (state.Stream.StreamLength > SAHPI_CTRL_MAX_STREAM_LENGTH) {
            KVI_DLOG(KVI_LOG_DBG_H, "Invalid stream length (%d).", state.Stream.StreamLength);
            return SA_ERR_HPI_INVALID_PARAMS;
        }
        return SA_OK;
    case SAHPI_CTRL_TYPE_TEXT:
        return validateTextState(rec.TypeUnion.Text, state.Text);
    default:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid control type (%d).", type);
        return SA_ERR_HPI_ERROR;
    }
}

namespace
{

// The event states a sensor of each category can report; false for a
// category the standard does not define.
bool eventMaskOf(SaHpiEventCategoryT Category, SaHpiEventStateT *Mask) noexcept
{
    switch (Category) {
    case SAHPI_EC_UNSPECIFIED:
    case SAHPI_EC_USER:
    case SAHPI_EC_GENERIC:
        *Mask = 0x7FFF;
        return true;
    case SAHPI_EC_THRESHOLD:
        *Mask = 0x3F;
        return true;
    case SAHPI_EC_USAGE:
        *Mask = 0x07;
        return true;
    case SAHPI_EC_STATE:
    case SAHPI_EC_PRED_FAIL:
    case SAHPI_EC_LIMIT:
    case SAHPI_EC_PERFORMANCE:
    case SAHPI_EC_PRESENCE:
    case SAHPI_EC_ENABLE:
        *Mask = 0x03;
        return true;
    case SAHPI_EC_SEVERITY:
    case SAHPI_EC_AVAILABILITY:
        *Mask = 0x1FF;
        return true;
    case SAHPI_EC_REDUNDANCY:
        *Mask = 0xFF;
        return true;
    default:
        return false;
    }
}

// Only the three top bits of the sensor status may be set through the
// enables.
constexpr SaHpiSensorStatusT RESERVED_SENSOR_STATUS_BITS = 0x1F;

} // namespace

SaErrorT validateEvtEnables(SaHpiSensorEvtEnablesT *Enables, SaHpiEventCategoryT Category) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Enables);
    if ((Enables->SensorStatus & RESERVED_SENSOR_STATUS_BITS) != 0) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid sensor status in enables 0x%x", Enables->SensorStatus);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SaHpiEventStateT mask = 0;
    if (!eventMaskOf(Category, &mask)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid event category %d", Category);
        return SA_ERR_HPI_ERROR;
    }
    if ((Enables->AssertEvents & ~mask) != 0) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid assert events in enables 0x%x", Enables->AssertEvents);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if ((Enables->DeassertEvents & ~mask) != 0) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid deassert events in enables 0x%x", Enables->DeassertEvents);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return SA_OK;
}

namespace
{

bool isBool(SaHpiBoolT Value) noexcept
{
    return Value == SAHPI_FALSE || Value == SAHPI_TRUE;
}

// By reference: a value outside the enumeration is never loaded as one.
template <typename E> bool inRange(const E &Value, std::underlying_type_t<E> Last) noexcept
{
    return kviCsRawEnum(Value) <= Last;
}

// The expiration flags a client may write: one per timer use, bits 1 to 5.
constexpr SaHpiWatchdogExpFlagsT WATCHDOG_EXP_FLAGS =
    SAHPI_WATCHDOG_EXP_BIOS_FRB2 | SAHPI_WATCHDOG_EXP_BIOS_POST | SAHPI_WATCHDOG_EXP_OS_LOAD |
    SAHPI_WATCHDOG_EXP_SMS_OS | SAHPI_WATCHDOG_EXP_OEM;

} // namespace

// What a watchdog set may ask for: Log and Running are booleans; the timer
// use, action and pre-timer interrupt are values of their enumerations (the
// OEM and unspecified codes included); the pre-timeout interval fits inside
// the initial count, since the pre-timeout fires that long before expiry;
// only the five defined expiration flags may be written. PresentCount is read
// only and not checked.
SaErrorT validateWatchdog(const SaHpiWatchdogT *Watchdog) noexcept
{
    KVI_NULL_CHECK(Watchdog);
    const auto use = kviCsRawEnum(Watchdog->TimerUse);
    const auto interrupt = kviCsRawEnum(Watchdog->PretimerInterrupt);
    if (!isBool(Watchdog->Log) || !isBool(Watchdog->Running)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid param");
        return SA_ERR_HPI_INVALID_DATA;
    }
    if ((use > SAHPI_WTU_OEM && use != SAHPI_WTU_UNSPECIFIED) ||
        !inRange(Watchdog->TimerAction, SAHPI_WA_POWER_CYCLE) ||
        (interrupt > SAHPI_WPI_MESSAGE_INTERRUPT && interrupt != SAHPI_WPI_OEM)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid");
        return SA_ERR_HPI_INVALID_DATA;
    }
    if (Watchdog->PreTimeoutInterval > Watchdog->InitialCount) {
        KVI_DLOG(KVI_LOG_DBG_H, "%d > %d!", Watchdog->PreTimeoutInterval, Watchdog->InitialCount);
        return SA_ERR_HPI_INVALID_DATA;
    }
    if ((Watchdog->TimerUseExpFlags & ~WATCHDOG_EXP_FLAGS) != 0) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid params");
        return SA_ERR_HPI_INVALID_DATA;
    }
    return SA_OK;
}

// ---- The frame of the redirected calls ----
//
// Every call about one resource or record runs the same steps: argument
// checks, the gate, the plug-in master lock, the lookup of the active
// resource or record, the call's own test, the test of the plug-in's slot,
// the plug-in's lock, and only then, with the master lock already given back
// so that loading plug-ins is never held up by a slow one, the plug-in
// itself. KviRedirectedCall runs the steps up to the plug-in; each call below
// adds what is its own.

namespace
{

constexpr SaHpiUint32T MAPL_MASTER_LOCK_TIMEOUT = 1000;
constexpr SaHpiUint32T MAPL_LOCK_TIMEOUT = 1000;

// A record that a call addresses and what its lookup found.
struct KviRdrTarget {
    struct Address {
        SaHpiSessionIdT sessionId;
        SaHpiResourceIdT resourceId;
        SaHpiUint8T number;
        SaHpiRdrTypeT type;
    };
    SaHpiResourceIdT resourceId = 0;
    SaHpiUint8T number = 0;
    SaHpiDomainIdT domainId = SAHPI_DEFAULT_DOMAIN_ID;
    SaHpiRdrT rdr{};
    void *userData = nullptr;
    KviDsRdrFnTable fnTable{};
    SaHpiUint32T maplNum = 0;
    KviCsRwLockT *maplLock = nullptr;
};

// A resource that a call addresses and what its lookup found.
// domainController lets SAHPI_DOMAIN_CONTROLLER_ID name the domain's first
// active resource, whose event log is the domain's.
struct KviRptTarget {
    struct Address {
        SaHpiSessionIdT sessionId;
        SaHpiResourceIdT resourceId;
        bool domainController;
    };
    SaHpiResourceIdT resourceId = 0;
    SaHpiUint8T number = 0;
    SaHpiDomainIdT domainId = SAHPI_DEFAULT_DOMAIN_ID;
    SaHpiRptEntryT rptEntry{};
    void *userDefined = nullptr;
    KviDsRptFnTable fnTable{};
    SaHpiUint32T maplNum = 0;
    KviCsRwLockT *maplLock = nullptr;
};

SaErrorT domainOf(SaHpiSessionIdT SessionId, SaHpiDomainIdT *DomainId) noexcept
{
    const SaErrorT rc = kviCsGetDomainFromSession(SessionId, DomainId);
    return rc == SA_OK ? SA_OK : passOrError(rc, {SA_ERR_HPI_INVALID_SESSION});
}

SaErrorT lookUp(const KviRdrTarget::Address &At, KviRdrTarget &T) noexcept
{
    T.resourceId = At.resourceId;
    T.number = At.number;
    return getActiveRdr(At.sessionId, At.resourceId, At.number, At.type, &T.rdr, &T.domainId,
                        &T.userData, &T.fnTable, &T.maplNum, &T.maplLock);
}

SaErrorT lookUp(const KviRptTarget::Address &At, KviRptTarget &T) noexcept
{
    SaErrorT rc = domainOf(At.sessionId, &T.domainId);
    if (rc != SA_OK)
        return rc;
    T.resourceId = At.resourceId;
    if (At.domainController && At.resourceId == SAHPI_DOMAIN_CONTROLLER_ID) {
        SaHpiEntryIdT next = 0;
        rc = kviCsRptActiveEntryGet(T.domainId, SAHPI_FIRST_ENTRY, &next, &T.rptEntry, nullptr);
        if (rc != SA_OK) {
            KVI_DLOG(KVI_LOG_DBG_H, "kviCsRptActiveEntryGet failed. rc=%d", rc);
            return rc;
        }
        T.resourceId = T.rptEntry.ResourceId;
    }
    rc = kviCsRptActiveEntryGetByRid(T.domainId, T.resourceId, &T.rptEntry, &T.fnTable,
                                     &T.userDefined, &T.maplNum, &T.maplLock);
    if (rc != SA_OK)
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsRptActiveEntryGetByRid failed. rc=%d", rc);
    return rc;
}

// The plug-in slot a call runs and the lines it writes about it. The lines
// take the resource id, then the record number (which most ignore); a
// failure line takes the plug-in's result first.
template <class Target> struct KviSlot {
    bool (*present)(const Target &);
    const char *missing;
    const char *failed;
    SaHpiUint32T level = KVI_LOG_ERR_NONFATAL_NUM;
    const char *busy = nullptr; // event logs tell a busy log apart
};

#define KVI_SLOT_PRESENT(Target, Name) [](const Target &T) { return T.fnTable.Name != nullptr; }
#define KVI_SLOT_MISSING(Name) #Name " entry in fnTable for resource %u is NULL.  Leaving now."
#define KVI_SLOT_FAILED(Name) #Name " failed. rc=%d, rid=%u"
#define KVI_RDR_SLOT(Name)                                                                         \
    KviSlot<KviRdrTarget>                                                                          \
    {                                                                                              \
        KVI_SLOT_PRESENT(KviRdrTarget, Name), KVI_SLOT_MISSING(Name), KVI_SLOT_FAILED(Name)        \
    }
#define KVI_RPT_SLOT(Name)                                                                         \
    KviSlot<KviRptTarget>                                                                          \
    {                                                                                              \
        KVI_SLOT_PRESENT(KviRptTarget, Name), KVI_SLOT_MISSING(Name), KVI_SLOT_FAILED(Name)        \
    }
#define KVI_EVENT_LOG_SLOT(Name)                                                                   \
    KviSlot<KviRptTarget>                                                                          \
    {                                                                                              \
        KVI_SLOT_PRESENT(KviRptTarget, Name), KVI_SLOT_MISSING(Name), KVI_SLOT_FAILED(Name),       \
            KVI_LOG_DBG_H_NUM, #Name " returned busy. rid=%u"                                      \
    }

constexpr auto noCheck = [](const auto &) noexcept { return SA_OK; };

// The steps and lines of the frame that do not depend on what was looked up.
class KviRedirectedCallBase
{
  public:
    // The plug-in's result, unchanged; a failure is logged.
    SaErrorT finish(SaErrorT Rc) noexcept
    {
        if (Rc == SA_ERR_HPI_BUSY && texts_.busy != nullptr)
            KVI_API_SITE_LOG(site_, KVI_LOG_DBG_H_NUM, texts_.busy, resourceId_);
        else if (Rc != SA_OK)
            KVI_API_SITE_LOG(site_, texts_.level, texts_.failed, Rc, resourceId_, number_);
        return Rc;
    }

    // A failed save of what a successful call changed is only logged: the
    // plug-in did what the client asked.
    void saved(SaErrorT Rc, const char *Failed) noexcept
    {
        if (Rc != SA_OK)
            KVI_API_SITE_LOG(site_, KVI_LOG_ERR_NONFATAL_NUM, Failed, Rc);
    }

  protected:
    struct Texts {
        const char *missing;
        const char *failed;
        SaHpiUint32T level;
        const char *busy;
    };
    KviRedirectedCallBase(const KviCallSite &Site, const Texts &T) noexcept
        : site_(Site), texts_(T), gate_(Site), master_(Site, MASTER_LOCK_TEXTS),
          mapl_(Site, MAPL_LOCK_TEXTS)
    {
    }

    SaErrorT enterAndLock(SaHpiSessionIdT SessionId) noexcept
    {
        const SaErrorT rc = gate_.enter(SessionId);
        return rc != SA_OK ? rc : master_.acquire(maplMasterLock, MAPL_MASTER_LOCK_TIMEOUT);
    }

    SaErrorT lockPlugin(bool SlotPresent, KviCsRwLockT *MaplLock) noexcept
    {
        if (!SlotPresent) {
            KVI_API_SITE_LOG(site_, texts_.level, texts_.missing, resourceId_, number_);
            return SA_ERR_HPI_INVALID_CMD;
        }
        const SaErrorT rc = mapl_.acquire(MaplLock, MAPL_LOCK_TIMEOUT);
        if (rc == SA_OK)
            master_.release();
        return rc;
    }

    SaHpiResourceIdT resourceId_ = 0;
    SaHpiUint8T number_ = 0;

  private:
    KviCallSite site_;
    Texts texts_;
    // Declared in the order they are taken, so that they go in reverse.
    KviApiGate gate_;
    KviApiLock<false> master_;
    KviApiLock<false> mapl_;
};

template <class Target> class KviRedirectedCall : public KviRedirectedCallBase
{
  public:
    KviRedirectedCall(const KviCallSite &Site, const KviSlot<Target> &Slot) noexcept
        : KviRedirectedCallBase(Site, {Slot.missing, Slot.failed, Slot.level, Slot.busy}),
          present_(Slot.present)
    {
    }

    // Every step up to the plug-in call. On SA_OK the plug-in's lock is held
    // and the master lock already given back; on any other result nothing is
    // held any more once the call object goes.
    template <class Check = decltype(noCheck)>
    SaErrorT open(const typename Target::Address &At, Check check = noCheck) noexcept
    {
        SaErrorT rc = enter(At);
        if (rc != SA_OK)
            return rc;
        rc = check(target_);
        return rc != SA_OK ? rc : lockPlugin(present_(target_), target_.maplLock);
    }

    // The gate, the master lock and the lookup alone, for the calls that
    // answer from the record itself.
    SaErrorT enter(const typename Target::Address &At) noexcept
    {
        const SaErrorT rc = enterAndLock(At.sessionId);
        if (rc != SA_OK)
            return rc;
        const SaErrorT found = lookUp(At, target_);
        resourceId_ = target_.resourceId;
        number_ = target_.number;
        return found;
    }

    Target &target() noexcept { return target_; }

  private:
    bool (*present_)(const Target &);
    Target target_;
};

using KviRdrCall = KviRedirectedCall<KviRdrTarget>;
using KviRptCall = KviRedirectedCall<KviRptTarget>;

#define KVI_REDIRECT(Kind, Slot) Kind call(KVI_CALL_SITE("&MaplLock"), Slot)
#define KVI_OPEN_OR_RETURN(...)                                                                    \
    do {                                                                                           \
        const SaErrorT openRc_ = call.open(__VA_ARGS__);                                           \
        if (openRc_ != SA_OK)                                                                      \
            return openRc_;                                                                        \
    } while (0)

// The calls' own tests, run before the slot test.
SaErrorT thresholdSensor(const KviRdrTarget &T) noexcept
{
    if (T.rdr.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold == SAHPI_TRUE)
        return SA_OK;
    KVI_DLOG(KVI_LOG_DBG_H, "Sensor Does not support thresholds Sensor Num=%d", T.number);
    return SA_ERR_HPI_INVALID_CMD;
}

const SaHpiSensorRecT &sensorOf(const KviRdrTarget &T) noexcept
{
    return T.rdr.RdrTypeUnion.SensorRec;
}

// The resource's capabilities, which the event-enable slots are told.
SaErrorT capabilitiesOf(const KviRdrTarget &T, SaHpiCapabilitiesT *Capabilities) noexcept
{
    SaHpiRptEntryT entry{};
    const SaErrorT rc = kviCsRptActiveEntryGetByRid(T.domainId, T.resourceId, &entry, nullptr,
                                                    nullptr, nullptr, nullptr);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsRptActiveEntryGetByRid failed. rc=%d", rc);
        return rc;
    }
    *Capabilities = entry.ResourceCapabilities;
    return SA_OK;
}

// Values a C caller passes by value are read as integers and held to their
// enumeration before anything is locked.
template <typename E>
SaErrorT enumArgument(const char *Name, const E &Value, std::underlying_type_t<E> Last) noexcept
{
    if (inRange(Value, Last))
        return SA_OK;
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value (%d) in %s.", kviCsRawEnum(Value), Name);
    return SA_ERR_HPI_INVALID_PARAMS;
}
#define KVI_ENUM_CHECK(Arg, Last)                                                                  \
    do {                                                                                           \
        const SaErrorT enumRc_ = enumArgument(#Arg, Arg, Last);                                    \
        if (enumRc_ != SA_OK)                                                                      \
            return enumRc_;                                                                        \
    } while (0)

// A timeout is SAHPI_TIMEOUT_BLOCK or not negative, held to it like an enum.
#define KVI_TIMEOUT_CHECK(Arg)                                                                     \
    do {                                                                                           \
        if (!kviCsTimeoutIsValid(Arg)) {                                                           \
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value (%lld) in %s.",                          \
                     static_cast<long long>(Arg), #Arg);                                           \
            return SA_ERR_HPI_INVALID_PARAMS;                                                      \
        }                                                                                          \
    } while (0)

// Hot swap is for field-replaceable resources: any FRU tells its hot-swap
// state, and only one with the managed model takes the other requests.
template <SaHpiCapabilitiesT Needed> SaErrorT hotSwapCapable(const KviRptTarget &T) noexcept
{
    if ((T.rptEntry.ResourceCapabilities & Needed) == Needed)
        return SA_OK;
    KVI_DLOG(KVI_LOG_DBG_H, "Hot swap capability not set. rid=%u", T.resourceId);
    return SA_ERR_HPI_INVALID_CMD;
}
constexpr auto fruHotSwap = hotSwapCapable<SAHPI_CAPABILITY_FRU>;
constexpr auto managedHotSwap =
    hotSwapCapable<SAHPI_CAPABILITY_FRU | SAHPI_CAPABILITY_MANAGED_HOTSWAP>;

} // namespace

extern "C" {

// ---- Sensors ----

KVI_EXPORT SaErrorT saHpiSensorReadingGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiSensorNumT SensorNum,
                                          SaHpiSensorReadingT *Reading) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(Reading);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorReadingGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR});
    KviRdrTarget &t = call.target();
    return call.finish(t.fnTable.SensorReadingGet(
        t.domainId, ResourceId, SensorNum, sensorOf(t).Category, &t.rdr, t.userData, Reading));
}

KVI_EXPORT SaErrorT saHpiSensorReadingConvert(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiSensorNumT SensorNum,
                                              SaHpiSensorReadingT *ReadingInput,
                                              SaHpiSensorReadingT *ConvertedReading) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(ReadingInput);
    KVI_NULL_CHECK(ConvertedReading);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorReadingConvert));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR});
    KviRdrTarget &t = call.target();
    return call.finish(t.fnTable.SensorReadingConvert(t.domainId, ResourceId, SensorNum, &t.rdr,
                                                      ReadingInput, t.userData, ConvertedReading));
}

KVI_EXPORT SaErrorT saHpiSensorThresholdsGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiSensorNumT SensorNum,
                                             SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(SensorThresholds);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorThresholdsGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR}, thresholdSensor);
    KviRdrTarget &t = call.target();
    return call.finish(t.fnTable.SensorThresholdsGet(t.domainId, ResourceId, SensorNum, &t.rdr,
                                                     t.userData, SensorThresholds));
}

KVI_EXPORT SaErrorT saHpiSensorThresholdsSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiSensorNumT SensorNum,
                                             SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(SensorThresholds);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorThresholdsSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR}, thresholdSensor);
    KviRdrTarget &t = call.target();
    const SaErrorT rc = call.finish(t.fnTable.SensorThresholdsSet(
        t.domainId, ResourceId, SensorNum, &t.rdr, SensorThresholds, t.userData));
    if (rc == SA_OK)
        call.saved(
            kviCsSaveThreshNV(t.domainId, ResourceId, SensorNum, SAHPI_TRUE, SensorThresholds),
            "kviIsSaveThreshNV failed. rc=%d");
    return rc;
}

KVI_EXPORT SaErrorT saHpiSensorTypeGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                       SaHpiSensorNumT SensorNum, SaHpiSensorTypeT *Type,
                                       SaHpiEventCategoryT *Category) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(Type);
    KVI_NULL_CHECK(Category);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorReadingGet));
    const SaErrorT rc = call.enter({SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR});
    if (rc != SA_OK)
        return rc;
    *Type = sensorOf(call.target()).Type;
    *Category = sensorOf(call.target()).Category;
    return SA_OK;
}

KVI_EXPORT SaErrorT saHpiSensorEventEnablesGet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiSensorNumT SensorNum,
                                               SaHpiSensorEvtEnablesT *Enables) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(Enables);
    SaHpiCapabilitiesT capabilities = 0;
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorEventEnablesGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR},
                       [&](const KviRdrTarget &T) { return capabilitiesOf(T, &capabilities); });
    KviRdrTarget &t = call.target();
    return call.finish(t.fnTable.SensorEventEnablesGet(t.domainId, ResourceId, SensorNum,
                                                       t.userData, capabilities,
                                                       sensorOf(t).Category, Enables));
}

KVI_EXPORT SaErrorT saHpiSensorEventEnablesSet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiSensorNumT SensorNum,
                                               SaHpiSensorEvtEnablesT *Enables) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, sensor#=%u", SessionId, ResourceId, SensorNum);
    KVI_NULL_CHECK(Enables);
    SaHpiCapabilitiesT capabilities = 0;
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(SensorEventEnablesSet));
    KVI_OPEN_OR_RETURN(
        {SessionId, ResourceId, SensorNum, SAHPI_SENSOR_RDR}, [&](const KviRdrTarget &T) {
            KVI_DLOG(KVI_LOG_DBG_L, "Sensor Status: %d", Enables->SensorStatus);
            KVI_DLOG(KVI_LOG_DBG_L, "Assert Events %d", Enables->AssertEvents);
            KVI_DLOG(KVI_LOG_DBG_L, "Deassert Events %d", Enables->DeassertEvents);
            const SaErrorT rc = capabilitiesOf(T, &capabilities);
            return rc != SA_OK ? rc : validateEvtEnables(Enables, sensorOf(T).Category);
        });
    KviRdrTarget &t = call.target();
    const SaErrorT rc = call.finish(t.fnTable.SensorEventEnablesSet(
        t.domainId, ResourceId, SensorNum, Enables, &t.rdr, capabilities, t.userData));
    if (rc == SA_OK)
        call.saved(kviCsSaveEvtEnablesNV(t.domainId, ResourceId, SensorNum, SAHPI_TRUE, Enables),
                   "kviIsSaveEvtEnablesNV failed. rc=%d");
    return rc;
}

// ---- Controls ----

KVI_EXPORT SaErrorT saHpiControlTypeGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                        SaHpiCtrlNumT CtrlNum, SaHpiCtrlTypeT *Type) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, ctrl#=%u", SessionId, ResourceId, CtrlNum);
    KVI_NULL_CHECK(Type);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(ControlStateGet));
    const SaErrorT rc = call.enter({SessionId, ResourceId, CtrlNum, SAHPI_CTRL_RDR});
    if (rc != SA_OK)
        return rc;
    *Type = call.target().rdr.RdrTypeUnion.CtrlRec.Type;
    return SA_OK;
}

KVI_EXPORT SaErrorT saHpiControlStateGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiCtrlNumT CtrlNum, SaHpiCtrlStateT *CtrlState) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, ctrl#=%u", SessionId, ResourceId, CtrlNum);
    KVI_NULL_CHECK(CtrlState);
    KVI_REDIRECT(KviRdrCall, (KviSlot<KviRdrTarget>{
                                 KVI_SLOT_PRESENT(KviRdrTarget, ControlStateGet),
                                 "Get control function is NULL.rid=%u, number=%u",
                                 "Get control state function failed. rc=%d, rid=%u, num=%u"}));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, CtrlNum, SAHPI_CTRL_RDR});
    KviRdrTarget &t = call.target();
    return call.finish(
        t.fnTable.ControlStateGet(t.domainId, ResourceId, CtrlNum, t.userData, CtrlState));
}

KVI_EXPORT SaErrorT saHpiControlStateSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiCtrlNumT CtrlNum, SaHpiCtrlStateT *CtrlState) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, ctrl#=%u", SessionId, ResourceId, CtrlNum);
    KVI_NULL_CHECK(CtrlState);
    KVI_REDIRECT(KviRdrCall, (KviSlot<KviRdrTarget>{
                                 KVI_SLOT_PRESENT(KviRdrTarget, ControlStateSet),
                                 "Set control function is NULL. rid=%u, number=%u",
                                 "Set control state function failed. rc=%d, rid=%u, num=%u"}));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, CtrlNum, SAHPI_CTRL_RDR}, [&](KviRdrTarget &T) {
        const SaErrorT rc = validateControlState(&T.rdr, CtrlState);
        if (rc != SA_OK)
            KVI_DLOG(KVI_LOG_DBG_H, "Control state validation failed (%d).", rc);
        return rc;
    });
    KviRdrTarget &t = call.target();
    const SaErrorT rc = call.finish(
        t.fnTable.ControlStateSet(t.domainId, ResourceId, CtrlNum, CtrlState, t.userData));
    // The daemon's copy, so that a restart puts the state back.
    if (rc == SA_OK)
        call.saved(kviCsSaveCtrlStateNV(t.domainId, ResourceId, CtrlNum, SAHPI_TRUE, CtrlState),
                   "kviIsSaveCtrlStateNV failed. rc=%d");
    return rc;
}

// ---- Inventory ----

KVI_EXPORT SaErrorT saHpiEntityInventoryDataRead(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId, SaHpiEirIdT EirId,
                                                 SaHpiUint32T BufferSize,
                                                 SaHpiInventoryDataT *InventData,
                                                 SaHpiUint32T *ActualSize) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, eir=%u, size=%u", SessionId, ResourceId, EirId, BufferSize);
    KVI_NULL_CHECK(InventData);
    KVI_NULL_CHECK(ActualSize);
    KVI_REDIRECT(KviRdrCall,
                 (KviSlot<KviRdrTarget>{KVI_SLOT_PRESENT(KviRdrTarget, EntityInventoryDataRead),
                                        "EntityInventoryDataRead entry in fnTable is NULL. rid=%u, "
                                        "number=%u",
                                        KVI_SLOT_FAILED(EntityInventoryDataRead)}));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, EirId, SAHPI_INVENTORY_RDR});
    KviRdrTarget &t = call.target();
    const SaErrorT rc = call.finish(t.fnTable.EntityInventoryDataRead(
        t.domainId, ResourceId, EirId, BufferSize, t.userData, InventData, ActualSize));
    KVI_DLOG(KVI_LOG_DBG_H, "rc = %d", rc);
    return rc;
}

KVI_EXPORT SaErrorT saHpiEntityInventoryDataWrite(SaHpiSessionIdT SessionId,
                                                  SaHpiResourceIdT ResourceId, SaHpiEirIdT EirId,
                                                  SaHpiInventoryDataT *InventData) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, eir=%u", SessionId, ResourceId, EirId);
    KVI_NULL_CHECK(InventData);
    KVI_REDIRECT(KviRdrCall, (KviSlot<KviRdrTarget>{
                                 KVI_SLOT_PRESENT(KviRdrTarget, EntityInventoryDataWrite),
                                 "EntityInventoryDataWrite entry in fnTable is NULL. rid=%u, "
                                 "number=%u",
                                 KVI_SLOT_FAILED(EntityInventoryDataWrite)}));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, EirId, SAHPI_INVENTORY_RDR});
    KviRdrTarget &t = call.target();
    const SaErrorT rc = call.finish(
        t.fnTable.EntityInventoryDataWrite(t.domainId, ResourceId, EirId, InventData, t.userData));
    KVI_DLOG(KVI_LOG_DBG_H, "rc = %d", rc);
    return rc;
}

// ---- Watchdogs ----

KVI_EXPORT SaErrorT saHpiWatchdogTimerGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiWatchdogNumT WatchdogNum,
                                          SaHpiWatchdogT *Watchdog) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, wd#=%u", SessionId, ResourceId, WatchdogNum);
    KVI_NULL_CHECK(Watchdog);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(WatchdogTimerGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, WatchdogNum, SAHPI_WATCHDOG_RDR});
    KviRdrTarget &t = call.target();
    return call.finish(
        t.fnTable.WatchdogTimerGet(t.domainId, ResourceId, WatchdogNum, t.userData, Watchdog));
}

namespace
{
void logWatchdog(const SaHpiWatchdogT *W) noexcept
{
    KVI_DLOG(KVI_LOG_DBG_L, "InitialCount %d", W->InitialCount);
    KVI_DLOG(KVI_LOG_DBG_L, "Log %d", W->Log);
    KVI_DLOG(KVI_LOG_DBG_L, "PresentCount %d", W->PresentCount);
    KVI_DLOG(KVI_LOG_DBG_L, "PreTimeoutInterval %d", W->PreTimeoutInterval);
    KVI_DLOG(KVI_LOG_DBG_L, "PretimerInterrupt %d", kviCsRawEnum(W->PretimerInterrupt));
    KVI_DLOG(KVI_LOG_DBG_L, "Running %d", W->Running);
    KVI_DLOG(KVI_LOG_DBG_L, "TimerAction %d", kviCsRawEnum(W->TimerAction));
    KVI_DLOG(KVI_LOG_DBG_L, "TimerUse %d", kviCsRawEnum(W->TimerUse));
    KVI_DLOG(KVI_LOG_DBG_L, "TimerUseExpFlags %d", W->TimerUseExpFlags);
}
} // namespace

KVI_EXPORT SaErrorT saHpiWatchdogTimerSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiWatchdogNumT WatchdogNum,
                                          SaHpiWatchdogT *Watchdog) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, wd#=%u", SessionId, ResourceId, WatchdogNum);
    KVI_NULL_CHECK(Watchdog);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(WatchdogTimerSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, WatchdogNum, SAHPI_WATCHDOG_RDR},
                       [&](const KviRdrTarget &) {
                           logWatchdog(Watchdog);
                           return validateWatchdog(Watchdog);
                       });
    KviRdrTarget &t = call.target();
    const SaErrorT rc = call.finish(
        t.fnTable.WatchdogTimerSet(t.domainId, ResourceId, WatchdogNum, Watchdog, t.userData));
    KVI_DLOG(KVI_LOG_DBG_H, "rc = %d", rc);
    return rc;
}

KVI_EXPORT SaErrorT saHpiWatchdogTimerReset(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                            SaHpiWatchdogNumT WatchdogNum) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, wd#=%u", SessionId, ResourceId, WatchdogNum);
    KVI_REDIRECT(KviRdrCall, KVI_RDR_SLOT(WatchdogTimerReset));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, WatchdogNum, SAHPI_WATCHDOG_RDR});
    KviRdrTarget &t = call.target();
    return call.finish(
        t.fnTable.WatchdogTimerReset(t.domainId, ResourceId, WatchdogNum, t.userData));
}

} // extern "C"

// ---- Event logs ----
//
// SAHPI_DOMAIN_CONTROLLER_ID names the domain's own log, which the domain's
// first active resource keeps.

namespace
{
// "No entries present." is what a client reading or deleting in an empty log
// gets; the code itself passes through.
SaErrorT noEntriesNoted(SaErrorT Rc) noexcept
{
    if (Rc == SA_ERR_HPI_NOT_PRESENT)
        KVI_DLOG(KVI_LOG_DBG_H, "No entries present.");
    return Rc;
}

KviRptTarget::Address eventLogOf(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId) noexcept
{
    return {SessionId, ResourceId, true};
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT saHpiEventLogInfoGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiSelInfoT *Info) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(Info);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogInfoGet));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.EventLogInfoGet(t.domainId, t.resourceId, t.userDefined, Info));
}

KVI_EXPORT SaErrorT saHpiEventLogEntryGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiSelEntryIdT EntryId, SaHpiSelEntryIdT *PrevEntryId,
                                          SaHpiSelEntryIdT *NextEntryId,
                                          SaHpiSelEntryT *EventLogEntry, SaHpiRdrT *Rdr,
                                          SaHpiRptEntryT *RptEntry) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, entry=%u", SessionId, ResourceId, EntryId);
    KVI_NULL_CHECK(PrevEntryId);
    KVI_NULL_CHECK(NextEntryId);
    KVI_NULL_CHECK(EventLogEntry);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogEntryGet));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return noEntriesNoted(call.finish(
        t.fnTable.EventLogEntryGet(t.domainId, t.resourceId, EntryId, t.userDefined, PrevEntryId,
                                   NextEntryId, EventLogEntry, Rdr, RptEntry)));
}

KVI_EXPORT SaErrorT saHpiEventLogEntryAdd(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiSelEntryT *EvtEntry) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(EvtEntry);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogEntryAdd));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.EventLogEntryAdd(t.domainId, t.resourceId, EvtEntry, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiEventLogEntryDelete(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiSelEntryIdT EntryId) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, entry=%u", SessionId, ResourceId, EntryId);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogEntryDelete));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return noEntriesNoted(call.finish(
        t.fnTable.EventLogEntryDelete(t.domainId, t.resourceId, EntryId, t.userDefined)));
}

KVI_EXPORT SaErrorT saHpiEventLogClear(SaHpiSessionIdT SessionId,
                                       SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogClear));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.EventLogClear(t.domainId, t.resourceId, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiEventLogTimeGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiTimeT *Time) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(Time);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogTimeGet));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.EventLogTimeGet(t.domainId, t.resourceId, t.userDefined, Time));
}

KVI_EXPORT SaErrorT saHpiEventLogTimeSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiTimeT Time) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogTimeSet));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.EventLogTimeSet(t.domainId, t.resourceId, Time, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiEventLogStateGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiBoolT *Enable) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(Enable);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogStateGet));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.EventLogStateGet(t.domainId, t.resourceId, t.userDefined, Enable));
}

KVI_EXPORT SaErrorT saHpiEventLogStateSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                          SaHpiBoolT Enable) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, enable=%d", SessionId, ResourceId, Enable);
    KVI_REDIRECT(KviRptCall, KVI_EVENT_LOG_SLOT(EventLogStateSet));
    KVI_OPEN_OR_RETURN(eventLogOf(SessionId, ResourceId));
    KviRptTarget &t = call.target();
    const SaErrorT rc =
        call.finish(t.fnTable.EventLogStateSet(t.domainId, t.resourceId, Enable, t.userDefined));
    if (rc == SA_OK)
        call.saved(kviCsSaveEvtLogStNV(t.domainId, t.resourceId, SAHPI_TRUE, Enable),
                   "kviCsSaveEvtLogStNV failed. rc=%d");
    return rc;
}

// ---- Reset and power ----

KVI_EXPORT SaErrorT saHpiResourceResetStateGet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiResetActionT *ResetAction) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(ResetAction);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(ResourceResetStateGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false});
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.ResourceResetStateGet(t.domainId, ResourceId, t.userDefined, ResetAction));
}

KVI_EXPORT SaErrorT saHpiResourceResetStateSet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiResetActionT ResetAction) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, action=%d", SessionId, ResourceId, kviCsRawEnum(ResetAction));
    KVI_ENUM_CHECK(ResetAction, SAHPI_RESET_DEASSERT);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(ResourceResetStateSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false});
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.ResourceResetStateSet(t.domainId, ResourceId, ResetAction, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiResourcePowerStateGet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiHsPowerStateT *State) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(State);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(ResourcePowerStateGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false});
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.ResourcePowerStateGet(t.domainId, ResourceId, t.userDefined, State));
}

KVI_EXPORT SaErrorT saHpiResourcePowerStateSet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiHsPowerStateT State) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, state=%d", SessionId, ResourceId, kviCsRawEnum(State));
    KVI_ENUM_CHECK(State, SAHPI_HS_POWER_CYCLE);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(ResourcePowerStateSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false});
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.ResourcePowerStateSet(t.domainId, ResourceId, State, t.userDefined));
}

// ---- Hot swap ----

KVI_EXPORT SaErrorT saHpiHotSwapControlRequest(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(HotSwapControlRequest));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.HotSwapControlRequest(t.domainId, ResourceId, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiResourceActiveSet(SaHpiSessionIdT SessionId,
                                           SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(ResourceActiveSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.ResourceActiveSet(t.domainId, ResourceId, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiResourceInactiveSet(SaHpiSessionIdT SessionId,
                                             SaHpiResourceIdT ResourceId) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(ResourceInactiveSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.ResourceInactiveSet(t.domainId, ResourceId, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiAutoExtractTimeoutGet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiTimeoutT *Timeout) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(Timeout);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(AutoExtractTimeoutGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.AutoExtractTimeoutGet(t.domainId, ResourceId, t.userDefined, Timeout));
}

KVI_EXPORT SaErrorT saHpiAutoExtractTimeoutSet(SaHpiSessionIdT SessionId,
                                               SaHpiResourceIdT ResourceId,
                                               SaHpiTimeoutT Timeout) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, timeout=%lld", SessionId, ResourceId,
              static_cast<long long>(Timeout));
    KVI_TIMEOUT_CHECK(Timeout);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(AutoExtractTimeoutSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.AutoExtractTimeoutSet(t.domainId, ResourceId, Timeout, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiHotSwapStateGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                         SaHpiHsStateT *State) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(State);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(HotSwapStateGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, fruHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(t.fnTable.HotSwapStateGet(t.domainId, ResourceId, t.userDefined, State));
}

KVI_EXPORT SaErrorT saHpiHotSwapActionRequest(SaHpiSessionIdT SessionId,
                                              SaHpiResourceIdT ResourceId,
                                              SaHpiHsActionT Action) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, action=%d", SessionId, ResourceId, kviCsRawEnum(Action));
    KVI_ENUM_CHECK(Action, SAHPI_HS_ACTION_EXTRACTION);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(HotSwapActionRequest));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.HotSwapActionRequest(t.domainId, ResourceId, Action, t.userDefined));
}

KVI_EXPORT SaErrorT saHpiHotSwapIndicatorStateGet(SaHpiSessionIdT SessionId,
                                                  SaHpiResourceIdT ResourceId,
                                                  SaHpiHsIndicatorStateT *State) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(State);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(HotSwapIndicatorStateGet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.HotSwapIndicatorStateGet(t.domainId, ResourceId, t.userDefined, State));
}

KVI_EXPORT SaErrorT saHpiHotSwapIndicatorStateSet(SaHpiSessionIdT SessionId,
                                                  SaHpiResourceIdT ResourceId,
                                                  SaHpiHsIndicatorStateT State) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, state=%d", SessionId, ResourceId, kviCsRawEnum(State));
    KVI_ENUM_CHECK(State, SAHPI_HS_INDICATOR_ON);
    KVI_REDIRECT(KviRptCall, KVI_RPT_SLOT(HotSwapIndicatorStateSet));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, managedHotSwap);
    KviRptTarget &t = call.target();
    return call.finish(
        t.fnTable.HotSwapIndicatorStateSet(t.domainId, ResourceId, State, t.userDefined));
}

// ---- Parameter control ----
//
// Not a slot of its own: the library walks the resource and its records
// through their parameter-control slots, under the plug-in's lock.

KVI_EXPORT SaErrorT saHpiParmControl(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                     SaHpiParmActionT Action) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, action=%d", SessionId, ResourceId, kviCsRawEnum(Action));
    KVI_ENUM_CHECK(Action, SAHPI_RESTORE_PARM);
    KVI_REDIRECT(KviRptCall, (KviSlot<KviRptTarget>{[](const KviRptTarget &) { return true; }, "",
                                                    "ParmControl failed. rc=%d, rid=%u"}));
    KVI_OPEN_OR_RETURN({SessionId, ResourceId, false}, [](const KviRptTarget &T) {
        if ((T.rptEntry.ResourceCapabilities & SAHPI_CAPABILITY_CONFIGURATION) != 0)
            return SA_OK;
        KVI_DLOG(KVI_LOG_DBG_H, "Configuration capability not set. Parm Control not Supported");
        return SA_ERR_HPI_INVALID_CMD;
    });
    KviRptTarget &t = call.target();
    return call.finish(kviCsParmControl(t.domainId, ResourceId, Action, &t.fnTable, t.userDefined));
}

// ---- Calls answered from the library's own tables ----

// The library is not itself a resource.
KVI_EXPORT SaErrorT saHpiResourceIdGet(SaHpiSessionIdT SessionId,
                                       SaHpiResourceIdT *ResourceId) noexcept
{
    KVI_TRACE("sess=%u", SessionId);
    KVI_NULL_CHECK(ResourceId);
    return SA_ERR_HPI_UNKNOWN;
}

KVI_EXPORT SaErrorT saHpiEntitySchemaGet(SaHpiSessionIdT SessionId, SaHpiUint32T *SchemaId) noexcept
{
    KVI_TRACE("sess=%u", SessionId);
    KVI_NULL_CHECK(SchemaId);
    REDIR_API_BEGIN_BLOCK(SessionId);
    SaHpiDomainIdT domainId = SAHPI_DEFAULT_DOMAIN_ID;
    const SaErrorT rc = domainOf(SessionId, &domainId);
    REDIR_API_END_BLOCK(rc != SA_OK ? rc : kviCsEntitySchemaGet(SchemaId));
}

} // extern "C"

namespace
{
// What a table call passes on to its client; anything else from the tables
// is the library's own failure.
SaErrorT tableResult(const char *Name, SaErrorT Rc) noexcept
{
    KVI_DLOG(KVI_LOG_DBG_L, "%s() rc=%d", Name, Rc);
    const SaErrorT passed =
        passOrError(Rc, {SA_OK, SA_ERR_HPI_INVALID_RESOURCE, SA_ERR_HPI_NOT_PRESENT,
                         SA_ERR_HPI_INVALID_PARAMS, SA_ERR_HPI_OUT_OF_SPACE});
    if (passed != Rc)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "%s() rc=%d, returning SA_ERR_HPI_ERROR", Name, Rc);
    return passed;
}

// Opens the gate and finds the session's domain, or returns what refused.
#define KVI_TABLE_CALL_BEGIN(SessionId, DomainVar)                                                 \
    REDIR_API_BEGIN_BLOCK(SessionId);                                                              \
    SaHpiDomainIdT DomainVar = SAHPI_DEFAULT_DOMAIN_ID;                                            \
    do {                                                                                           \
        const SaErrorT domainRc_ = domainOf(SessionId, &DomainVar);                                \
        if (domainRc_ != SA_OK)                                                                    \
            REDIR_API_END_BLOCK(domainRc_);                                                        \
    } while (0)
} // namespace

extern "C" {

KVI_EXPORT SaErrorT saHpiRptInfoGet(SaHpiSessionIdT SessionId, SaHpiRptInfoT *RptInfo) noexcept
{
    KVI_TRACE("sess=%u", SessionId);
    KVI_NULL_CHECK(RptInfo);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    REDIR_API_END_BLOCK(tableResult("kviCsRptInfoGet", kviCsRptInfoGet(domainId, RptInfo)));
}

KVI_EXPORT SaErrorT saHpiRptEntryGet(SaHpiSessionIdT SessionId, SaHpiEntryIdT EntryId,
                                     SaHpiEntryIdT *NextEntryId, SaHpiRptEntryT *RptEntry) noexcept
{
    KVI_TRACE("sess=%u, entry=%u", SessionId, EntryId);
    KVI_NULL_CHECK(NextEntryId);
    KVI_NULL_CHECK(RptEntry);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    REDIR_API_END_BLOCK(
        tableResult("kviCsRptActiveEntryGet",
                    kviCsRptActiveEntryGet(domainId, EntryId, NextEntryId, RptEntry, nullptr)));
}

KVI_EXPORT SaErrorT saHpiRptEntryGetByResourceId(SaHpiSessionIdT SessionId,
                                                 SaHpiResourceIdT ResourceId,
                                                 SaHpiRptEntryT *RptEntry) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(RptEntry);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    // Read aside first: an inactive resource's entry is not the client's to see.
    SaHpiRptEntryT entry{};
    SaHpiBoolT active = SAHPI_FALSE;
    SaErrorT rc = kviCsRptEntryGetByRid(domainId, ResourceId, &entry, &active, nullptr);
    if (rc == SA_ERR_HPI_NOT_PRESENT)
        rc = SA_ERR_HPI_INVALID_RESOURCE;
    rc = tableResult("kviCsRptEntryGetByRid", rc);
    if (rc == SA_OK && active != SAHPI_TRUE) {
        KVI_DLOG(KVI_LOG_DBG_H, "Inactive resource %d Requested", ResourceId);
        rc = SA_ERR_HPI_INVALID_RESOURCE;
    }
    if (rc == SA_OK)
        *RptEntry = entry;
    REDIR_API_END_BLOCK(rc);
}

KVI_EXPORT SaErrorT saHpiResourceSeveritySet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                             SaHpiSeverityT Severity) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, severity=%d", SessionId, ResourceId, kviCsRawEnum(Severity));
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    REDIR_API_END_BLOCK(
        tableResult("kviCsRptEntryModifySeverityByRid",
                    kviCsRptEntryModifySeverityByRid(domainId, ResourceId, Severity)));
}

KVI_EXPORT SaErrorT saHpiResourceTagSet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                        SaHpiTextBufferT *ResourceTag) noexcept
{
    KVI_TRACE("sess=%u, rid=%u", SessionId, ResourceId);
    KVI_NULL_CHECK(ResourceTag);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    REDIR_API_END_BLOCK(
        tableResult("kviCsRptEntryModifyTagByRid",
                    kviCsRptEntryModifyTagByRid(domainId, ResourceId, ResourceTag)));
}

KVI_EXPORT SaErrorT saHpiRdrGet(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId,
                                SaHpiEntryIdT EntryId, SaHpiEntryIdT *NextEntryId,
                                SaHpiRdrT *Rdr) noexcept
{
    KVI_TRACE("sess=%u, rid=%u, entry=%u", SessionId, ResourceId, EntryId);
    KVI_NULL_CHECK(NextEntryId);
    KVI_NULL_CHECK(Rdr);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    // Read aside first: the records of an inactive resource are not the
    // client's to see, just as its entry is not.
    SaHpiRdrT rdr{};
    SaHpiEntryIdT next = SAHPI_LAST_ENTRY;
    SaHpiBoolT active = SAHPI_FALSE;
    SaErrorT rc = tableResult("kviCsRdrGet",
                              kviCsRdrGet(domainId, ResourceId, SAHPI_NO_RECORD, EntryId, &next,
                                          &rdr, &active, nullptr, nullptr, nullptr, nullptr));
    if (rc == SA_OK && active != SAHPI_TRUE) {
        KVI_DLOG(KVI_LOG_DBG_H, "Inactive resource %d Requested", ResourceId);
        rc = SA_ERR_HPI_INVALID_RESOURCE;
    }
    if (rc == SA_OK) {
        *Rdr = rdr;
        *NextEntryId = next;
    }
    REDIR_API_END_BLOCK(rc);
}

} // extern "C"

// ---- Events ----

namespace
{
// The record and the entry of an event's source, appended when the caller
// asks for them. What cannot be appended is marked, never an error: the event
// itself was delivered.
void appendRdr(SaHpiSessionIdT SessionId, const SaHpiEventT &Event, SaHpiRdrT *Rdr) noexcept
{
    SaHpiDomainIdT domainId = SAHPI_DEFAULT_DOMAIN_ID;
    SaErrorT rc = kviCsGetDomainFromSession(SessionId, &domainId);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Not appending RDR because session to domain translation failed. rc = %d", rc);
        Rdr->RdrType = SAHPI_NO_RECORD;
        return;
    }
    const auto type = kviCsRawEnum(Event.EventType);
    if (type == SAHPI_ET_SENSOR || type == SAHPI_ET_WATCHDOG) {
        const bool sensor = type == SAHPI_ET_SENSOR;
        rc = getActiveRdr(SessionId, Event.Source,
                          sensor ? Event.EventDataUnion.SensorEvent.SensorNum
                                 : Event.EventDataUnion.WatchdogEvent.WatchdogNum,
                          sensor ? SAHPI_SENSOR_RDR : SAHPI_WATCHDOG_RDR, Rdr, &domainId, nullptr,
                          nullptr, nullptr, nullptr);
    } else {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Not appending RDR because EventType isn't sensor or watchdog. et = %d", type);
        rc = SA_ERR_HPI_ERROR;
    }
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "Not appending RDR because getActiveRdr failed. rc = %d", rc);
        Rdr->RdrType = SAHPI_NO_RECORD;
    }
}

// ResourceCapabilities 0 tells the caller that no entry was appended.
void appendRptEntry(SaHpiSessionIdT SessionId, const SaHpiEventT &Event,
                    SaHpiRptEntryT *RptEntry) noexcept
{
    SaHpiDomainIdT domainId = SAHPI_DEFAULT_DOMAIN_ID;
    SaErrorT rc = kviCsGetDomainFromSession(SessionId, &domainId);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Not appending RPT because session to domain translation failed. rc = %d", rc);
        RptEntry->ResourceCapabilities = 0;
        return;
    }
    rc = kviCsRptActiveEntryGetByRid(domainId, Event.Source, RptEntry, nullptr, nullptr, nullptr,
                                     nullptr);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Not appending RPT because kviCsRptActiveEntryGetByRid failed. rc = %d", rc);
        RptEntry->ResourceCapabilities = 0;
    }
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviDsSubscribe(SaHpiSessionIdT SessionId, SaHpiBoolT ProvideActiveAlarms,
                                   SaHpiUint32T *InitialEventNumber) noexcept
{
    KVI_TRACE("SessionId: %d, Provide Active alarms: %d", SessionId, ProvideActiveAlarms);
    REDIR_API_BEGIN_BLOCK(SessionId);
    // Gathering active alarms calls into the plug-ins: none may be unloaded
    // meanwhile.
    KviApiLock<false> master(KVI_CALL_SITE("maplMasterLock"), MASTER_LOCK_TEXTS);
    SaErrorT rc = master.acquire(maplMasterLock, MAPL_MASTER_LOCK_TIMEOUT);
    if (rc != SA_OK)
        REDIR_API_END_BLOCK(rc);
    rc = kviCsSubscribe(SessionId, ProvideActiveAlarms, InitialEventNumber);
    if (rc != SA_OK)
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsSubscribe failed.  rc=%d", rc);
    master.release();
    REDIR_API_END_BLOCK(rc);
}

KVI_EXPORT SaErrorT saHpiUnsubscribe(SaHpiSessionIdT SessionId) noexcept
{
    KVI_TRACE("SessionId: %d", SessionId);
    REDIR_API_BEGIN_BLOCK(SessionId);
    const SaErrorT rc = kviCsUnsubscribe(SessionId);
    if (rc != SA_OK)
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsUnsubscribe failed.  rc=%d", rc);
    REDIR_API_END_BLOCK(rc);
}

// The gate stays open while the call waits, so a finalize waits for blocked
// readers, up to its own time-out.
KVI_EXPORT SaErrorT kviDsEventGet(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout,
                                  SaHpiEventT *Event, SaHpiUint32T *EventNumber, SaHpiRdrT *Rdr,
                                  SaHpiRptEntryT *RptEntry) noexcept
{
    KVI_TRACE("SessionId: %d", SessionId);
    KVI_NULL_CHECK(Event);
    KVI_NULL_CHECK(EventNumber);
    REDIR_API_BEGIN_BLOCK(SessionId);
    const SaErrorT rc = kviCsGetEvent(SessionId, Timeout, Event, EventNumber);
    if (rc != SA_OK)
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsGetEvent failed.  rc=%d", rc);
    if (rc != SA_OK && rc != SA_ERR_HPI_DATA_TRUNCATED)
        REDIR_API_END_BLOCK(rc);
    if (Rdr != nullptr)
        appendRdr(SessionId, *Event, Rdr);
    if (RptEntry != nullptr)
        appendRptEntry(SessionId, *Event, RptEntry);
    REDIR_API_END_BLOCK(rc);
}

// The standard's forms, for clients in the daemon's own process: the event
// numbers are the library's business.
KVI_EXPORT SaErrorT saHpiSubscribe(SaHpiSessionIdT SessionId,
                                   SaHpiBoolT ProvideActiveAlarms) noexcept
{
    SaHpiUint32T initial = 0;
    return kviDsSubscribe(SessionId, ProvideActiveAlarms, &initial);
}

KVI_EXPORT SaErrorT saHpiEventGet(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout,
                                  SaHpiEventT *Event, SaHpiRdrT *Rdr,
                                  SaHpiRptEntryT *RptEntry) noexcept
{
    SaHpiUint32T number = 0;
    return kviDsEventGet(SessionId, Timeout, Event, &number, Rdr, RptEntry);
}

// The auto-insert timeout is the domain's, not a resource's: the library
// keeps it, the plug-ins read it as their FRUs are inserted, and a change is
// saved for the daemon's restore like the other settings a client changes.
KVI_EXPORT SaErrorT saHpiAutoInsertTimeoutGet(SaHpiSessionIdT SessionId,
                                              SaHpiTimeoutT *Timeout) noexcept
{
    KVI_TRACE("sess=%u", SessionId);
    KVI_NULL_CHECK(Timeout);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    REDIR_API_END_BLOCK(kviCsAutoInsertTimeoutGet(domainId, Timeout));
}

KVI_EXPORT SaErrorT saHpiAutoInsertTimeoutSet(SaHpiSessionIdT SessionId,
                                              SaHpiTimeoutT Timeout) noexcept
{
    KVI_TRACE("sess=%u, timeout=%lld", SessionId, static_cast<long long>(Timeout));
    KVI_TIMEOUT_CHECK(Timeout);
    KVI_TABLE_CALL_BEGIN(SessionId, domainId);
    const SaErrorT rc = kviCsAutoInsertTimeoutSet(domainId, Timeout);
    if (rc == SA_OK && kviCsSaveAutoInsertTimeoutNV(domainId, SAHPI_TRUE, Timeout) != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSaveAutoInsertTimeoutNV failed.");
    REDIR_API_END_BLOCK(rc);
}

} // extern "C"
