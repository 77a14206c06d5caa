/* A plug-in for the plug-in manager's tests, compiled once per variant:
 *
 *   KVI_TEST_MAPL_NAME          text in every line the plug-in logs
 *   KVI_TEST_MAPL_VERSION       interface version reported by GetVersion
 *   KVI_TEST_MAPL_NULL_MEMBERS  init table members left NULL: 1 GetVersion,
 *                               2 MaplInitialization, 4 MaplFinalization,
 *                               8 ResourcesDiscover
 *   KVI_TEST_MAPL_WRONG_SYMBOL  exports the table as "KviModuleInitTable"
 *   KVI_TEST_MAPL_NULL_SYMBOL   "KviMaplInitTable" resolves to NULL
 *   KVI_TEST_MAPL_VERSION_FAILS GetVersion fails
 *   KVI_TEST_MAPL_INIT_FAILS    MaplInitialization fails
 *   KVI_TEST_MAPL_DISCOVER_FAILS ResourcesDiscover fails
 *   KVI_TEST_MAPL_SLOW          the resource's ResourcePowerStateGet blocks
 *                               until the test releases it
 *
 * Discovery adds one resource, once, with the plug-in's lock 0. The functions
 * named kviTestMapl* are for the tests, which find them with dlsym. */
#include <stdatomic.h>
#include <time.h>

#include "KviDaemonCore.h"

#ifndef KVI_TEST_MAPL_NAME
#define KVI_TEST_MAPL_NAME "TestMapl"
#endif
#ifndef KVI_TEST_MAPL_VERSION
#define KVI_TEST_MAPL_VERSION KVI_MAPL_INTR_VERSION
#endif
#ifndef KVI_TEST_MAPL_NULL_MEMBERS
#define KVI_TEST_MAPL_NULL_MEMBERS 0
#endif

/* The switches as values, so that every variant compiles every function. */
#ifdef KVI_TEST_MAPL_SLOW
#define SLOW_ 1
#else
#define SLOW_ 0
#endif
#ifdef KVI_TEST_MAPL_VERSION_FAILS
#define VERSION_FAILS_ 1
#else
#define VERSION_FAILS_ 0
#endif
#ifdef KVI_TEST_MAPL_INIT_FAILS
#define INIT_FAILS_ 1
#else
#define INIT_FAILS_ 0
#endif
#ifdef KVI_TEST_MAPL_DISCOVER_FAILS
#define DISCOVER_FAILS_ 1
#else
#define DISCOVER_FAILS_ 0
#endif

/* A slow call gives up on its own after this long, so a broken test cannot
 * hang the run. */
#define SLOW_CALL_LIMIT_MS 5000

static SaHpiUint32T maplNum = 0xFFFFFFFFu;
/* Discovery may run on several client threads at once. */
static atomic_uint resourceId;
static atomic_int discoveryClaimed;
static atomic_int slowCallsRunning;
static atomic_int slowCallsFinished;
static atomic_int slowCallsReleased;

SaHpiUint32T kviTestMaplSlot(void)
{
    return maplNum;
}

SaHpiResourceIdT kviTestMaplResource(void)
{
    return atomic_load(&resourceId);
}

int kviTestMaplSlowCallsRunning(void)
{
    return atomic_load(&slowCallsRunning);
}

void kviTestMaplReleaseSlowCalls(void)
{
    atomic_store(&slowCallsReleased, 1);
}

static void napOneMillisecond(void)
{
    const struct timespec nap = {0, 1000000};
    nanosleep(&nap, NULL);
}

static SaErrorT powerStateGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                              void *UserDefined, SaHpiHsPowerStateT *State)
{
    if (SLOW_) {
        atomic_fetch_add(&slowCallsRunning, 1);
        for (int waited = 0; waited < SLOW_CALL_LIMIT_MS && !atomic_load(&slowCallsReleased);
             waited++)
            napOneMillisecond();
        atomic_fetch_add(&slowCallsFinished, 1);
        atomic_fetch_sub(&slowCallsRunning, 1);
    }
    *State = SAHPI_HS_POWER_ON;
    return SA_OK;
}

static SaErrorT removeResource(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                               SaHpiRptEntryT *RptEntry, void *UserDefined, SaHpiBoolT Active,
                               KviDsRptFnTable *FnTable)
{
    KVI_ILOG(KVI_LOG_INFO, "TestMapl %s removed rid=%u", KVI_TEST_MAPL_NAME, ResourceId);
    KVI_CS_FREE(UserDefined);
    return SA_OK;
}

static KviDsRptFnTable rptFunctions = {
    .ResourcePowerStateGet = powerStateGet,
    .RptEntryResourcesRemove = removeResource,
};

static SaErrorT getVersion(SaHpiVersionT *Version)
{
    *Version = KVI_TEST_MAPL_VERSION;
    return VERSION_FAILS_ ? SA_ERR_HPI_ERROR : SA_OK;
}

static SaErrorT maplInitialization(SaHpiUint32T MaplNum)
{
    maplNum = MaplNum;
    KVI_ILOG(KVI_LOG_INFO, "TestMapl %s initialized in slot %u", KVI_TEST_MAPL_NAME, MaplNum);
    return INIT_FAILS_ ? SA_ERR_HPI_INITIALIZING : SA_OK;
}

static SaErrorT maplFinalization(void)
{
    KVI_ILOG(KVI_LOG_INFO, "TestMapl %s finalized, slow calls running %d finished %d",
             KVI_TEST_MAPL_NAME, atomic_load(&slowCallsRunning), atomic_load(&slowCallsFinished));
    return SA_OK;
}

static SaErrorT addResource(SaHpiDomainIdT DomainId)
{
    KviCsRwLockT *lock = NULL;
    SaErrorT rc = kviDsMaplManagerGetMaplLock(maplNum, 0, &lock);
    if (rc != SA_OK)
        return rc;
    SaHpiRptEntryT entry = {0};
    entry.ResourceCapabilities = SAHPI_CAPABILITY_RDR;
    entry.ResourceSeverity = SAHPI_OK;
    entry.ResourceTag.DataType = SAHPI_TL_TYPE_ASCII6;
    void *userData = KVI_CS_MALLOC(16);
    SaHpiResourceIdT added = 0;
    rc = kviCsRptEntryAdd(DomainId, entry, userData, SAHPI_TRUE, &rptFunctions, maplNum, lock,
                          &added);
    if (rc != SA_OK) {
        KVI_CS_FREE(userData);
        return rc;
    }
    atomic_store(&resourceId, added);
    KVI_ILOG(KVI_LOG_INFO, "TestMapl %s discovered rid=%u in slot %u", KVI_TEST_MAPL_NAME, added,
             maplNum);
    return SA_OK;
}

static SaErrorT resourcesDiscover(SaHpiDomainIdT DomainId)
{
    if (DISCOVER_FAILS_) {
        KVI_ILOG(KVI_LOG_INFO, "TestMapl %s fails discovery", KVI_TEST_MAPL_NAME);
        return SA_ERR_HPI_UNKNOWN;
    }
    if (atomic_exchange(&discoveryClaimed, 1) != 0)
        return SA_OK;
    const SaErrorT rc = addResource(DomainId);
    if (rc != SA_OK)
        atomic_store(&discoveryClaimed, 0);
    return rc;
}

#define MEMBER_(bit, fn) ((KVI_TEST_MAPL_NULL_MEMBERS & (bit)) ? NULL : (fn))
#define TABLE_                                                                                     \
    {                                                                                              \
        MEMBER_(1, getVersion), MEMBER_(2, maplInitialization), MEMBER_(4, maplFinalization),      \
            MEMBER_(8, resourcesDiscover),                                                         \
    }

#if defined(KVI_TEST_MAPL_NULL_SYMBOL)
/* An indirect symbol whose resolver yields NULL: the loader finds the name
 * and hands back a null address without an error. */
typedef void (*KviNothingT)(void);
static KviNothingT resolveToNothing(void)
{
    return NULL;
}
void KviMaplInitTable(void) __attribute__((ifunc("resolveToNothing")));
static KviMaplInitTableT unexportedTable __attribute__((used)) = TABLE_;
#elif defined(KVI_TEST_MAPL_WRONG_SYMBOL)
/* Named as the manager's messages name it, not as it looks it up. */
KviMaplInitTableT KviModuleInitTable = TABLE_;
#else
KviMaplInitTableT KviMaplInitTable = TABLE_;
#endif
