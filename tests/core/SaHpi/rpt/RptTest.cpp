#include <chrono>
#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "core/SaHpi/rpt/RptTestSupport.h"
#include "support/KviTestSupport.h"

namespace
{
using Ids = std::vector<SaHpiEntryIdT>;

// What the pretend plug-in's removal slots saw, in call order.
struct RemovalCall {
    char kind; // 'P' for the resource, 'R' for a record
    SaHpiResourceIdT resource;
    void *user;
    SaHpiBoolT active;
};
std::vector<RemovalCall> removals;
SaErrorT rptRemovalResult = SA_OK;

SaErrorT recordRptRemoval(SaHpiDomainIdT, SaHpiResourceIdT ResourceId, SaHpiRptEntryT *RptEntry,
                          void *UserDefined, SaHpiBoolT Active, KviDsRptFnTable *FnTable)
{
    EXPECT_EQ(RptEntry->ResourceId, ResourceId);
    EXPECT_EQ(FnTable->RptEntryResourcesRemove, &recordRptRemoval);
    removals.push_back({'P', ResourceId, UserDefined, Active});
    return rptRemovalResult;
}

SaErrorT recordRdrRemoval(SaHpiDomainIdT, SaHpiResourceIdT ResourceId, SaHpiRdrT *, void *UserData,
                          KviDsRdrFnTable *)
{
    removals.push_back({'R', ResourceId, UserData, SAHPI_FALSE});
    return SA_OK;
}

KviDsRptFnTable recordingTable()
{
    KviDsRptFnTable table{};
    table.RptEntryResourcesRemove = recordRptRemoval;
    return table;
}

Ids activeWalk()
{
    Ids ids;
    SaHpiEntryIdT next = SAHPI_FIRST_ENTRY;
    while (next != SAHPI_LAST_ENTRY) {
        SaHpiRptEntryT entry{};
        if (kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, next, &next, &entry, nullptr) != SA_OK)
            break;
        ids.push_back(entry.ResourceId);
    }
    return ids;
}

class RptTest : public ResourceModelTest
{
  protected:
    void SetUp() override
    {
        ResourceModelTest::SetUp();
        removals.clear();
        rptRemovalResult = SA_OK;
    }
};

TEST_F(RptTest, IdsStartAtOneAndAreNotReusedAfterRemoval)
{
    SaHpiResourceIdT first = addResource(SAHPI_TRUE);
    EXPECT_EQ(first, 1u);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, first), SA_OK);
    EXPECT_EQ(addResource(SAHPI_TRUE), 2u);
}

TEST_F(RptTest, WalkGoesByListNumberThenByAgeNotById)
{
    for (int i = 0; i < 7; i++)
        addResource(SAHPI_TRUE);
    EXPECT_EQ(walkRpt(), (Ids{5, 1, 6, 2, 7, 3, 4}));
    EXPECT_EQ(activeWalk(), (Ids{5, 1, 6, 2, 7, 3, 4}));

    SaHpiEntryIdT next = 0;
    SaHpiBoolT active = SAHPI_FALSE;
    ASSERT_EQ(kviCsRptEntryGet(SAHPI_DEFAULT_DOMAIN_ID, 4, &next, nullptr, &active, nullptr),
              SA_OK);
    EXPECT_EQ(next, SAHPI_LAST_ENTRY);
}

TEST_F(RptTest, ActiveWalkSkipsInactiveEntriesButReadsAnyNamedOne)
{
    for (int i = 1; i <= 7; i++)
        addResource(i == 5 || i == 2 || i == 4 ? SAHPI_FALSE : SAHPI_TRUE);
    EXPECT_EQ(walkRpt(), (Ids{5, 1, 6, 2, 7, 3, 4}));
    EXPECT_EQ(activeWalk(), (Ids{1, 6, 7, 3}));

    // Named directly, an inactive entry is returned; the next id skips past
    // the inactive ones, up to the end.
    SaHpiEntryIdT next = 0;
    SaHpiRptEntryT entry{};
    ASSERT_EQ(kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, 2, &next, &entry, nullptr), SA_OK);
    EXPECT_EQ(entry.ResourceId, 2u);
    EXPECT_EQ(next, 7u);
    ASSERT_EQ(kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, 3, &next, &entry, nullptr), SA_OK);
    EXPECT_EQ(next, SAHPI_LAST_ENTRY);
}

TEST_F(RptTest, EmptyOrAllInactiveTableHasNoFirstEntry)
{
    SaHpiEntryIdT next = 0;
    SaHpiRptEntryT entry{};
    SaHpiBoolT active = SAHPI_FALSE;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsRptEntryGet(SAHPI_DEFAULT_DOMAIN_ID, SAHPI_FIRST_ENTRY, &next, &entry, &active,
                               nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("kviCsRptGetNextEntry failed.  Returned -1024"));
    EXPECT_EQ(
        kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, SAHPI_FIRST_ENTRY, &next, &entry, nullptr),
        SA_ERR_HPI_NOT_PRESENT);
    addResource(SAHPI_FALSE);
    EXPECT_EQ(
        kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, SAHPI_FIRST_ENTRY, &next, &entry, nullptr),
        SA_ERR_HPI_NOT_PRESENT);
}

TEST_F(RptTest, ReadsRefuseTheLastEntryIdAndUnknownIds)
{
    addResource(SAHPI_TRUE);
    SaHpiBoolT active = SAHPI_FALSE;
    SaHpiRptEntryT entry{};
    EXPECT_EQ(kviCsRptEntryGet(SAHPI_DEFAULT_DOMAIN_ID, SAHPI_LAST_ENTRY, nullptr, &entry, &active,
                               nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(
        kviCsRptActiveEntryGet(SAHPI_DEFAULT_DOMAIN_ID, SAHPI_LAST_ENTRY, nullptr, &entry, nullptr),
        SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, 42, &entry, &active, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsRptActiveEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, 42, &entry, nullptr, nullptr,
                                          nullptr, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, 1, &entry, nullptr, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Active pointer is NULL."));
}

TEST_F(RptTest, ActiveLookupHandsOutWhatThePluginRegistered)
{
    int user = 0;
    KviDsRptFnTable table = recordingTable();
    SaHpiResourceIdT id = addResource(SAHPI_FALSE, kOtherMapl, table, &user, otherLock());
    SaHpiRptEntryT entry{};
    KviDsRptFnTable copy{};
    void *userOut = nullptr;
    SaHpiUint32T mapl = 0;
    KviCsRwLockT *lock = nullptr;
    EXPECT_EQ(kviCsRptActiveEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &entry, &copy, &userOut,
                                          &mapl, &lock),
              SA_ERR_HPI_NOT_PRESENT);
    ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_TRUE), SA_OK);
    ASSERT_EQ(kviCsRptActiveEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &entry, &copy, &userOut,
                                          &mapl, &lock),
              SA_OK);
    EXPECT_EQ(entry.ResourceId, id);
    EXPECT_EQ(copy.RptEntryResourcesRemove, &recordRptRemoval);
    EXPECT_EQ(userOut, &user);
    EXPECT_EQ(mapl, kOtherMapl);
    EXPECT_EQ(lock, otherLock());
    ASSERT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_OK);
}

TEST_F(RptTest, EntriesOnlyGoFromInactiveToActive)
{
    SaHpiResourceIdT id = addResource(SAHPI_FALSE);
    SaHpiTextBufferT tag = makeRptEntry().ResourceTag;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &tag),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("Called on Inactive Resource: " + std::to_string(id)));
    EXPECT_EQ(kviCsRptEntryModifySeverityByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_MAJOR),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, 2),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Non-Bool value (2) in Active."));

    ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_FALSE),
              SA_ERR_HPI_INVALID);
    EXPECT_TRUE(log.contains("Transition to Inactive is invalid."));
    EXPECT_EQ(kviCsRptEntryModifyByRid(SAHPI_DEFAULT_DOMAIN_ID, id, makeRptEntry(), nullptr),
              SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Entry Container is Active, refusing to modify."));
    SaHpiBoolT active = SAHPI_FALSE;
    ASSERT_EQ(kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, nullptr, &active, nullptr), SA_OK);
    EXPECT_TRUE(active);
}

TEST_F(RptTest, ModifyReplacesAnInactiveEntryUnderItsOwnId)
{
    SaHpiResourceIdT id = addResource(SAHPI_FALSE, kTestMapl, recordingTable());
    SaHpiRptEntryT replacement = makeRptEntry(SAHPI_CAPABILITY_SENSOR);
    replacement.EntryId = 99;
    replacement.ResourceId = 98;
    replacement.ResourceSeverity = SAHPI_CRITICAL;
    ASSERT_EQ(kviCsRptEntryModifyByRid(SAHPI_DEFAULT_DOMAIN_ID, id, replacement, nullptr), SA_OK);
    SaHpiRptEntryT stored{};
    SaHpiBoolT active = SAHPI_TRUE;
    ASSERT_EQ(kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &stored, &active, nullptr), SA_OK);
    EXPECT_EQ(stored.EntryId, id);
    EXPECT_EQ(stored.ResourceId, id);
    EXPECT_EQ(stored.ResourceSeverity, SAHPI_CRITICAL);
    EXPECT_EQ(stored.ResourceCapabilities, SAHPI_CAPABILITY_SENSOR);
    EXPECT_FALSE(active);

    // Without a table the plug-in's old one stays; with one it is replaced.
    ASSERT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_OK);
    EXPECT_EQ(removals.size(), 1u);
    id = addResource(SAHPI_FALSE, kTestMapl, recordingTable());
    KviDsRptFnTable empty{};
    ASSERT_EQ(kviCsRptEntryModifyByRid(SAHPI_DEFAULT_DOMAIN_ID, id, replacement, &empty), SA_OK);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_OK);
    EXPECT_EQ(removals.size(), 1u);
}

TEST_F(RptTest, InvalidTagsAndSeveritiesAreRefusedBeforeTheLock)
{
    SaHpiResourceIdT id = addResource(SAHPI_TRUE);
    SaHpiTextBufferT badType = makeRptEntry().ResourceTag;
    storeRaw(badType.DataType, 4);
    SaHpiTextBufferT badLanguage = makeRptEntry().ResourceTag;
    storeRaw(badLanguage.Language, 137);

    // With the table held every call that waits for it would take seconds;
    // these return at once.
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &badType),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &badLanguage),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, id, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    for (int severity : {5, 0xEF, 0xF1, 0xFF}) {
        SCOPED_TRACE(severity);
        EXPECT_EQ(kviCsRptEntryModifySeverityByRid(SAHPI_DEFAULT_DOMAIN_ID, id,
                                                   static_cast<SaHpiSeverityT>(severity)),
                  SA_ERR_HPI_INVALID_PARAMS);
    }
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(2));
    kviCsRptUnlockRpt(rpt);
    EXPECT_TRUE(log.contains("Invalid value (4) in Tag.DataType."));
    EXPECT_TRUE(log.contains("Invalid value (137) in Tag.Language."));
    EXPECT_TRUE(log.contains("Tag pointer is NULL."));
    EXPECT_TRUE(log.contains("Invalid value for severity(5)"));

    SaHpiRptEntryT stored{};
    SaHpiBoolT active = SAHPI_FALSE;
    ASSERT_EQ(kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &stored, &active, nullptr), SA_OK);
    EXPECT_EQ(stored.ResourceSeverity, SAHPI_MINOR);
    EXPECT_EQ(stored.ResourceTag.Language, SAHPI_LANG_ENGLISH);
}

TEST_F(RptTest, ReservedIdsAreRefusedByEveryChange)
{
    addResource(SAHPI_TRUE);
    SaHpiUint32T before = updateCount();
    SaHpiTextBufferT tag = makeRptEntry().ResourceTag;
    void *user = nullptr;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    for (SaHpiResourceIdT id : {SAHPI_FIRST_ENTRY, SAHPI_LAST_ENTRY, SAHPI_UNSPECIFIED_RESOURCE_ID,
                                SAHPI_DOMAIN_CONTROLLER_ID}) {
        SCOPED_TRACE(id);
        EXPECT_EQ(kviCsRptEntryModifyByRid(SAHPI_DEFAULT_DOMAIN_ID, id, makeRptEntry(), nullptr),
                  SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id),
                  SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptEntryUserPointerSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, nullptr, &user),
                  SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptEntryUserPointerGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &user),
                  SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_TRUE),
                  SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &tag),
                  SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptEntryModifySeverityByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_OK),
                  SA_ERR_HPI_INVALID_RESOURCE);
    }
    EXPECT_TRUE(log.contains("Cannot use SAHPI_FIRST_ENTRY or SAHPI_LAST_ENTRY or "
                             "SAHPI_UNSPECIFIED_RESOURCE_ID for Modify"));
    EXPECT_EQ(updateCount(), before);
    EXPECT_EQ(walkRpt(), (Ids{1}));
}

TEST_F(RptTest, EverySuccessfulChangeCountsOnceAndNothingElseCounts)
{
    SaHpiUint32T count = updateCount();
    auto expectCount = [&](SaHpiUint32T added, const char *what) {
        count += added;
        EXPECT_EQ(updateCount(), count) << what;
    };
    SaHpiResourceIdT id = addResource(SAHPI_FALSE);
    expectCount(1, "add");
    ASSERT_EQ(kviCsRptEntryModifyByRid(SAHPI_DEFAULT_DOMAIN_ID, id, makeRptEntry(), nullptr),
              SA_OK);
    expectCount(1, "modify");
    ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_TRUE), SA_OK);
    expectCount(1, "activate");
    SaHpiTextBufferT tag{};
    tag.DataType = SAHPI_TL_TYPE_BINARY;
    tag.Language = SAHPI_LANG_ZULU;
    tag.Data[254] = 'z'; // the whole buffer is taken, whatever its length says
    ASSERT_EQ(kviCsRptEntryModifyTagByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &tag), SA_OK);
    expectCount(1, "tag");
    ASSERT_EQ(kviCsRptEntryModifySeverityByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_DEBUG), SA_OK);
    expectCount(1, "severity");
    SaHpiRptEntryT stored{};
    SaHpiBoolT active = SAHPI_FALSE;
    ASSERT_EQ(kviCsRptEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &stored, &active, nullptr), SA_OK);
    EXPECT_EQ(memcmp(&stored.ResourceTag, &tag, sizeof tag), 0);
    EXPECT_EQ(stored.ResourceSeverity, SAHPI_DEBUG);

    void *old = nullptr;
    kviCsRptEntryUserPointerSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, &old, &old);
    kviCsRptEntryModifyByRid(SAHPI_DEFAULT_DOMAIN_ID, id, makeRptEntry(), nullptr);
    kviCsRptEntryActiveStateSetByRid(SAHPI_DEFAULT_DOMAIN_ID, id, SAHPI_FALSE);
    kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id + 1);
    walkRpt();
    expectCount(0, "reads, user pointer and refused changes");

    SaHpiRptInfoT info{};
    ASSERT_EQ(kviCsRptInfoGet(SAHPI_DEFAULT_DOMAIN_ID, &info), SA_OK);
    EXPECT_NE(info.UpdateTimestamp, SAHPI_TIME_UNSPECIFIED);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_OK);
    expectCount(1, "remove");
}

TEST_F(RptTest, IdsWrapPastZeroAndMaxSkippingIdsInUse)
{
    addResource(SAHPI_TRUE); // keeps id 1 taken across the wrap
    setNextResourceId(0xFFFFFFFD);
    EXPECT_EQ(addResource(SAHPI_TRUE), 0xFFFFFFFDu);
    // The domain controller's id is handed out although no change accepts it.
    EXPECT_EQ(addResource(SAHPI_TRUE), SAHPI_DOMAIN_CONTROLLER_ID);
    EXPECT_EQ(addResource(SAHPI_TRUE), 2u);
    EXPECT_EQ(addResource(SAHPI_TRUE), 3u);
    // Filed by id mod 5: 0xFFFFFFFD in list 3 ahead of the younger 3, and
    // 0xFFFFFFFE alone in list 4.
    EXPECT_EQ(walkRpt(), (Ids{1, 2, 0xFFFFFFFD, 3, SAHPI_DOMAIN_CONTROLLER_ID}));
}

TEST_F(RptTest, FailedAllocationsLeaveTheTableAsItWasAndSpendTheId)
{
    addResource(SAHPI_TRUE);
    struct Case {
        SaHpiInt32T failing;
        SaErrorT result;
        const char *line;
    };
    // The entry, its list node, and the lists of its record repository.
    const Case cases[] = {
        {1, SA_ERR_HPI_OUT_OF_SPACE, "Unable to allocate memory.  Returned -1007"},
        {2, SA_ERR_HPI_OUT_OF_SPACE, "Unable to allocate node.  Returned -1007"},
        {3, SA_ERR_HPI_ERROR, "kviCsRdrRepositoryContainerInitialize Returned -1007"},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.failing);
        SaHpiInt32T blocks = liveBlocks();
        SaHpiUint32T count = updateCount();
        KviLogCapture log(KVI_LOG_DBG_L_NUM);
        KviDsRptFnTable table{};
        SaHpiResourceIdT id = 0;
        kviCsMemoryFailNthAllocation(c.failing);
        EXPECT_EQ(kviCsRptEntryAdd(SAHPI_DEFAULT_DOMAIN_ID, makeRptEntry(), nullptr, SAHPI_TRUE,
                                   &table, kTestMapl, testLock(), &id),
                  c.result);
        kviCsMemoryFailNthAllocation(0);
        EXPECT_TRUE(log.contains(c.line));
        EXPECT_EQ(id, SaHpiResourceIdT(c.failing + 1)) << "the id is handed out all the same";
        EXPECT_EQ(liveBlocks(), blocks);
        EXPECT_EQ(updateCount(), count);
        EXPECT_EQ(walkRpt(), (Ids{1}));
    }
    EXPECT_EQ(addResource(SAHPI_TRUE), 5u);
}

TEST_F(RptTest, NullArgumentsAndUnknownDomainsAreRefused)
{
    KviDsRptFnTable table{};
    SaHpiResourceIdT id = 0;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsRptEntryAdd(SAHPI_DEFAULT_DOMAIN_ID, makeRptEntry(), nullptr, SAHPI_TRUE, &table,
                               kTestMapl, testLock(), nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRptEntryAdd(SAHPI_DEFAULT_DOMAIN_ID, makeRptEntry(), nullptr, SAHPI_TRUE,
                               nullptr, kTestMapl, testLock(), &id),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRptEntryAdd(SAHPI_DEFAULT_DOMAIN_ID, makeRptEntry(), nullptr, SAHPI_TRUE, &table,
                               kTestMapl, nullptr, &id),
              SA_ERR_HPI_INVALID_PARAMS);
    for (const char *line :
         {"ResourceId pointer is NULL.", "FnTable pointer is NULL.", "MaplLock pointer is NULL."})
        EXPECT_TRUE(log.contains(line)) << line;
    EXPECT_EQ(kviCsRptEntryAdd(1, makeRptEntry(), nullptr, SAHPI_TRUE, &table, kTestMapl,
                               testLock(), &id),
              SA_ERR_HPI_INVALID_DOMAIN);
    EXPECT_TRUE(log.contains("kviCsRptLockRpt failed.  Returned -1022"));
    SaHpiRptInfoT info{};
    EXPECT_EQ(kviCsRptInfoGet(1, &info), SA_ERR_HPI_INVALID_DOMAIN);
    EXPECT_EQ(kviCsRptInfoGet(SAHPI_DEFAULT_DOMAIN_ID, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(walkRpt().empty());
    EXPECT_EQ(addResource(SAHPI_TRUE), 1u);
    EXPECT_EQ(kviCsRptEntryUserPointerGetByRid(SAHPI_DEFAULT_DOMAIN_ID, 1, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("UserDefined pointer is NULL."));
    EXPECT_EQ(kviCsRptEntryUserPointerSetByRid(SAHPI_DEFAULT_DOMAIN_ID, 1, &info, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("OldPointer pointer is NULL."));
}

TEST_F(RptTest, RemovalCallsThePluginOnceAfterTheRecordsAreGone)
{
    int user = 0;
    SaHpiResourceIdT id = addResource(SAHPI_FALSE, kTestMapl, recordingTable(), &user);
    KviDsRdrFnTable rdrTable{};
    rdrTable.RdrResourcesRemove = recordRdrRemoval;
    addRdr(id, SAHPI_SENSOR_RDR, rdrTable);
    addRdr(id, SAHPI_CTRL_RDR, rdrTable);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_OK);
    ASSERT_EQ(removals.size(), 3u);
    EXPECT_EQ(removals[0].kind, 'R');
    EXPECT_EQ(removals[1].kind, 'R');
    EXPECT_EQ(removals[2].kind, 'P');
    EXPECT_EQ(removals[2].user, &user);
    EXPECT_EQ(removals[2].active, SAHPI_FALSE);
    EXPECT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_ERR_HPI_NOT_PRESENT);
}

TEST_F(RptTest, AFailingPluginCleanupStillRemovesTheEntry)
{
    SaHpiResourceIdT id = addResource(SAHPI_TRUE, kTestMapl, recordingTable());
    rptRemovalResult = SA_ERR_HPI_ERROR;
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM);
    EXPECT_EQ(kviCsRptEntryRemoveByRid(SAHPI_DEFAULT_DOMAIN_ID, id), SA_ERR_HPI_UNKNOWN);
    EXPECT_TRUE(log.contains("RptEntryResourcesRemove failed with rc=-1001; continuing"));
    EXPECT_TRUE(log.contains("errorsFound"));
    EXPECT_TRUE(walkRpt().empty());
}

TEST_F(RptTest, RemovingAPluginsEntriesTakesConsecutiveOnesToo)
{
    // Walk order 5, 1, 6, 2, 7, 3, 4: entries 5 and 1, then 2 and 7 stand
    // next to each other, and so do 4 at the end and 5 at the start.
    const SaHpiUint32T owner[] = {0,         kTestMapl, kTestMapl,  kOtherMapl,
                                  kTestMapl, kTestMapl, kOtherMapl, kTestMapl};
    for (SaHpiResourceIdT id = 1; id <= 7; id++)
        addResource(SAHPI_TRUE, owner[id], recordingTable(), nullptr,
                    owner[id] == kTestMapl ? testLock() : otherLock());
    ASSERT_EQ(kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, kTestMapl), SA_OK);
    EXPECT_EQ(walkRpt(), (Ids{6, 3}));
    ASSERT_EQ(removals.size(), 5u);
    Ids removed;
    for (const RemovalCall &call : removals)
        removed.push_back(call.resource);
    EXPECT_EQ(removed, (Ids{5, 1, 2, 7, 4}));

    ASSERT_EQ(kviCsRptEntrysRemoveByLock(SAHPI_DEFAULT_DOMAIN_ID, otherLock()), SA_OK);
    EXPECT_TRUE(walkRpt().empty());
    EXPECT_EQ(kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, kTestMapl), SA_OK);
}

TEST_F(RptTest, AFailureWhileUnloadingAPluginEndsTheProcess)
{
    addResource(SAHPI_TRUE, kOtherMapl, recordingTable());
    rptRemovalResult = SA_ERR_HPI_ERROR;
    expectFatalExit([] { kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, kOtherMapl); },
                    "Unable to unload an entry.  MaplNum(8) DomainId(0) ResourceId(1)");
    rptRemovalResult = SA_OK;
}

TEST_F(RptTest, AHeldTableMakesOtherCallsBusy)
{
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    SaHpiRptInfoT info{};
    auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(kviCsRptInfoGet(SAHPI_DEFAULT_DOMAIN_ID, &info), SA_ERR_HPI_BUSY);
    EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(4900));
    kviCsRptUnlockRpt(rpt);
    EXPECT_TRUE(log.contains("Unable to wait on semaphore, returned -1006"));
    EXPECT_TRUE(log.contains("kviCsRprLockRpt returned busy"));
}

} // namespace
