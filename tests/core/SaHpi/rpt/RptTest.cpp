#include <chrono>
#include <string>
#include <tuple>

#include "core/SaHpi/rpt/RptTestSupport.h"

namespace
{
// What the pretend plug-in's removal slots saw, in call order: "P<id>" for a
// resource, "R<id>" for one of its records; and what the last resource
// removal was given.
std::vector<std::string> removals;
void *removedUser = nullptr;
SaHpiBoolT removedActive = SAHPI_TRUE;
SaErrorT rptRemovalResult = SA_OK;

SaErrorT recordRptRemoval(SaHpiDomainIdT, SaHpiResourceIdT ResourceId, SaHpiRptEntryT *RptEntry,
                          void *UserDefined, SaHpiBoolT Active, KviDsRptFnTable *FnTable)
{
    EXPECT_EQ(RptEntry->ResourceId, ResourceId);
    EXPECT_EQ(FnTable->RptEntryResourcesRemove, &recordRptRemoval);
    removals.push_back("P" + std::to_string(ResourceId));
    removedUser = UserDefined;
    removedActive = Active;
    return rptRemovalResult;
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
    for (SaHpiEntryIdT next = SAHPI_FIRST_ENTRY; next != SAHPI_LAST_ENTRY;) {
        SaHpiRptEntryT entry{};
        if (kviCsRptActiveEntryGet(0, next, &next, &entry, nullptr) != SA_OK)
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
    SaHpiRptEntryT stored(SaHpiResourceIdT Id)
    {
        SaHpiRptEntryT entry{};
        EXPECT_EQ(kviCsRptEntryGetByRid(0, Id, &entry, &active_, nullptr), SA_OK);
        return entry;
    }
    SaHpiBoolT active_ = SAHPI_FALSE;
};

// Ids 1..7 land in lists 1, 2, 3, 4, 0, 1, 2 of five: the walk goes list by
// list, and within a list by age. The active walk passes over inactive
// entries, but one named directly is read all the same.
TEST_F(RptTest, WalkGoesByListNumberThenByAgeAndTheActiveWalkSkipsInactiveEntries)
{
    SaHpiEntryIdT next = 0;
    SaHpiRptEntryT entry{};
    EXPECT_EQ(kviCsRptEntryGet(0, SAHPI_FIRST_ENTRY, &next, &entry, &active_, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsRptEntryGet(0, SAHPI_LAST_ENTRY, &next, &entry, &active_, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsRptActiveEntryGet(0, SAHPI_LAST_ENTRY, &next, &entry, nullptr),
              SA_ERR_HPI_INVALID_PARAMS);
    for (int i = 1; i <= 7; i++)
        addResource(i == 5 || i == 2 || i == 4 ? SAHPI_FALSE : SAHPI_TRUE);
    EXPECT_EQ(walkRpt(), (Ids{5, 1, 6, 2, 7, 3, 4}));
    EXPECT_EQ(activeWalk(), (Ids{1, 6, 7, 3}));
    ASSERT_EQ(kviCsRptActiveEntryGet(0, 2, &next, &entry, nullptr), SA_OK);
    EXPECT_EQ(entry.ResourceId, 2u);
    EXPECT_EQ(next, 7u);
    ASSERT_EQ(kviCsRptActiveEntryGet(0, 3, &next, &entry, nullptr), SA_OK);
    EXPECT_EQ(next, SAHPI_LAST_ENTRY);

    // Ids are not reused after a removal; an all-inactive table has no
    // first active entry.
    for (SaHpiResourceIdT id : {1, 3, 6, 7})
        ASSERT_EQ(kviCsRptEntryRemoveByRid(0, id), SA_OK);
    EXPECT_EQ(kviCsRptActiveEntryGet(0, SAHPI_FIRST_ENTRY, &next, &entry, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(addResource(SAHPI_TRUE), 8u);
}

// An entry is filled while inactive (modify replaces it under its own id and
// keeps the plug-in's table when given none), then made active, which is
// final; only an active entry takes tag and severity changes and is handed
// out for calls.
TEST_F(RptTest, EntriesAreFilledWhileInactiveAndOnlyEverBecomeActive)
{
    int user = 0;
    SaHpiResourceIdT id =
        addResource(SAHPI_FALSE, kOtherMapl, recordingTable(), &user, otherLock());
    SaHpiRptEntryT replacement = makeRptEntry(SAHPI_CAPABILITY_SENSOR);
    replacement.EntryId = 99;
    replacement.ResourceId = 98;
    ASSERT_EQ(kviCsRptEntryModifyByRid(0, id, replacement, nullptr), SA_OK);
    SaHpiRptEntryT entry = stored(id);
    EXPECT_EQ(entry.EntryId, id);
    EXPECT_EQ(entry.ResourceId, id);
    EXPECT_EQ(entry.ResourceCapabilities, SAHPI_CAPABILITY_SENSOR);
    EXPECT_FALSE(active_);

    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    SaHpiTextBufferT tag = makeRptEntry().ResourceTag;
    EXPECT_EQ(kviCsRptEntryModifyTagByRid(0, id, &tag), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsRptEntryModifySeverityByRid(0, id, SAHPI_MAJOR), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsRptActiveEntryGetByRid(0, id, &entry, nullptr, nullptr, nullptr, nullptr),
              SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(0, id, 2), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_FALSE), SA_ERR_HPI_INVALID);
    EXPECT_EQ(kviCsRptEntryModifyByRid(0, id, replacement, nullptr), SA_ERR_HPI_INVALID_REQUEST);
    for (const std::string &line : {"Called on Inactive Resource: " + std::to_string(id),
                                    std::string("Non-Bool value (2) in Active."),
                                    std::string("Transition to Inactive is invalid."),
                                    std::string("Entry Container is Active, refusing to modify.")})
        EXPECT_TRUE(log.contains(line)) << line;

    KviDsRptFnTable table{};
    void *userOut = nullptr;
    SaHpiUint32T mapl = 0;
    KviCsRwLockT *lock = nullptr;
    ASSERT_EQ(kviCsRptActiveEntryGetByRid(0, id, &entry, &table, &userOut, &mapl, &lock), SA_OK);
    EXPECT_EQ(table.RptEntryResourcesRemove, &recordRptRemoval);
    EXPECT_EQ(userOut, &user);
    EXPECT_EQ(mapl, kOtherMapl);
    EXPECT_EQ(lock, otherLock());

    // A modify with a table replaces the plug-in's one.
    id = addResource(SAHPI_FALSE, kTestMapl, recordingTable());
    table = {};
    ASSERT_EQ(kviCsRptEntryModifyByRid(0, id, replacement, &table), SA_OK);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(0, id), SA_OK);
    EXPECT_TRUE(removals.empty());
}

TEST_F(RptTest, InvalidTagsAndSeveritiesAreRefusedBeforeTheLock)
{
    SaHpiResourceIdT id = addResource(SAHPI_TRUE);
    SaHpiTextBufferT badType = makeRptEntry().ResourceTag, badLanguage = badType;
    storeRaw(badType.DataType, 4);
    storeRaw(badLanguage.Language, 137);
    // With the table held every call that waits for it would take seconds;
    // these return at once.
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    auto start = std::chrono::steady_clock::now();
    withRpt([&](KviCsRptContainerT *) {
        for (SaHpiTextBufferT *tag :
             {&badType, &badLanguage, static_cast<SaHpiTextBufferT *>(nullptr)})
            EXPECT_EQ(kviCsRptEntryModifyTagByRid(0, id, tag), SA_ERR_HPI_INVALID_PARAMS);
        for (int severity : {5, 0xEF, 0xF1, 0xFF})
            EXPECT_EQ(
                kviCsRptEntryModifySeverityByRid(0, id, static_cast<SaHpiSeverityT>(severity)),
                SA_ERR_HPI_INVALID_PARAMS)
                << severity;
    });
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::seconds(2));
    for (const char *line :
         {"Invalid value (4) in Tag.DataType.", "Invalid value (137) in Tag.Language.",
          "Tag pointer is NULL.", "Invalid value for severity(5)"})
        EXPECT_TRUE(log.contains(line)) << line;
    EXPECT_EQ(stored(id).ResourceSeverity, SAHPI_MINOR);
    EXPECT_EQ(stored(id).ResourceTag.Language, SAHPI_LANG_ENGLISH);
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
        for (SaErrorT rc : {kviCsRptEntryModifyByRid(0, id, makeRptEntry(), nullptr),
                            kviCsRptEntryRemoveByRid(0, id),
                            kviCsRptEntryUserPointerSetByRid(0, id, nullptr, &user),
                            kviCsRptEntryUserPointerGetByRid(0, id, &user),
                            kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_TRUE),
                            kviCsRptEntryModifyTagByRid(0, id, &tag),
                            kviCsRptEntryModifySeverityByRid(0, id, SAHPI_OK)})
            EXPECT_EQ(rc, SA_ERR_HPI_INVALID_RESOURCE);
    }
    EXPECT_EQ(log.matching("Cannot use SAHPI_FIRST_ENTRY or SAHPI_LAST_ENTRY or "
                           "SAHPI_UNSPECIFIED_RESOURCE_ID for Modify")
                  .size(),
              28u);
    EXPECT_EQ(updateCount(), before);
    EXPECT_EQ(walkRpt(), (Ids{1}));
}

// Add, modify, activate, tag, severity and remove count once each; reads,
// the user pointer and refused changes not at all.
TEST_F(RptTest, EverySuccessfulChangeCountsOnceAndNothingElseCounts)
{
    const SaHpiUint32T base = updateCount();
    auto counted = [base] { return updateCount() - base; };
    SaHpiResourceIdT id = addResource(SAHPI_FALSE);
    EXPECT_EQ(counted(), 1u);
    SaHpiTextBufferT tag{};
    tag.DataType = SAHPI_TL_TYPE_BINARY;
    tag.Language = SAHPI_LANG_ZULU;
    tag.Data[254] = 'z'; // the whole buffer is taken, whatever its length says
    EXPECT_EQ(kviCsRptEntryModifyByRid(0, id, makeRptEntry(), nullptr), SA_OK);
    EXPECT_EQ(counted(), 2u);
    EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_TRUE), SA_OK);
    EXPECT_EQ(counted(), 3u);
    EXPECT_EQ(kviCsRptEntryModifyTagByRid(0, id, &tag), SA_OK);
    EXPECT_EQ(counted(), 4u);
    EXPECT_EQ(kviCsRptEntryModifySeverityByRid(0, id, SAHPI_DEBUG), SA_OK);
    EXPECT_EQ(counted(), 5u);
    SaHpiRptEntryT entry = stored(id);
    EXPECT_EQ(memcmp(&entry.ResourceTag, &tag, sizeof tag), 0);
    EXPECT_EQ(entry.ResourceSeverity, SAHPI_DEBUG);

    void *old = nullptr;
    kviCsRptEntryUserPointerSetByRid(0, id, &old, &old);
    kviCsRptEntryModifyByRid(0, id, makeRptEntry(), nullptr);
    kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_FALSE);
    kviCsRptEntryRemoveByRid(0, id + 1);
    walkRpt();
    EXPECT_EQ(counted(), 5u);
    SaHpiRptInfoT info{};
    ASSERT_EQ(kviCsRptInfoGet(0, &info), SA_OK);
    EXPECT_NE(info.UpdateTimestamp, SAHPI_TIME_UNSPECIFIED);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(0, id), SA_OK);
    EXPECT_EQ(counted(), 6u);
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

// The entry, its list node, and the lists of its record repository.
TEST_F(RptTest, FailedAllocationsLeaveTheTableAsItWasAndSpendTheId)
{
    addResource(SAHPI_TRUE);
    const std::tuple<SaHpiInt32T, SaErrorT, const char *> cases[] = {
        {1, SA_ERR_HPI_OUT_OF_SPACE, "Unable to allocate memory.  Returned -1007"},
        {2, SA_ERR_HPI_OUT_OF_SPACE, "Unable to allocate node.  Returned -1007"},
        {3, SA_ERR_HPI_ERROR, "kviCsRdrRepositoryContainerInitialize Returned -1007"},
    };
    for (auto [failing, result, line] : cases) {
        SCOPED_TRACE(failing);
        SaHpiInt32T blocks = liveBlocks();
        SaHpiUint32T count = updateCount();
        KviLogCapture log(KVI_LOG_DBG_L_NUM);
        KviDsRptFnTable table{};
        SaHpiResourceIdT id = 0;
        kviCsMemoryFailNthAllocation(failing);
        EXPECT_EQ(kviCsRptEntryAdd(0, makeRptEntry(), nullptr, 1, &table, 7, testLock(), &id),
                  result);
        kviCsMemoryFailNthAllocation(0);
        EXPECT_TRUE(log.contains(line));
        EXPECT_EQ(id, SaHpiResourceIdT(failing + 1)) << "the id is handed out all the same";
        EXPECT_EQ(liveBlocks(), blocks);
        EXPECT_EQ(updateCount(), count);
        EXPECT_EQ(walkRpt(), (Ids{1}));
    }
    EXPECT_EQ(addResource(SAHPI_TRUE), 5u);
}

TEST_F(RptTest, NullArgumentsUnknownDomainsAndUnknownIdsAreRefused)
{
    KviDsRptFnTable table{};
    SaHpiResourceIdT id = 0;
    SaHpiRptInfoT info{};
    addResource(SAHPI_TRUE);
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    const SaHpiRptEntryT e = makeRptEntry();
    const std::tuple<SaErrorT, SaErrorT, const char *> cases[] = {
        {kviCsRptEntryAdd(0, e, nullptr, 1, &table, 7, testLock(), nullptr),
         SA_ERR_HPI_INVALID_PARAMS, "ResourceId pointer is NULL."},
        {kviCsRptEntryAdd(0, e, nullptr, 1, nullptr, 7, testLock(), &id), SA_ERR_HPI_INVALID_PARAMS,
         "FnTable pointer is NULL."},
        {kviCsRptEntryAdd(0, e, nullptr, 1, &table, 7, nullptr, &id), SA_ERR_HPI_INVALID_PARAMS,
         "MaplLock pointer is NULL."},
        {kviCsRptEntryGetByRid(0, 1, nullptr, nullptr, nullptr), SA_ERR_HPI_INVALID_PARAMS,
         "Active pointer is NULL."},
        {kviCsRptEntryUserPointerSetByRid(0, 1, &info, nullptr), SA_ERR_HPI_INVALID_PARAMS,
         "OldPointer pointer is NULL."},
        {kviCsRptEntryAdd(1, e, nullptr, 1, &table, 7, testLock(), &id), SA_ERR_HPI_INVALID_DOMAIN,
         "kviCsRptLockRpt failed.  Returned -1022"},
        {kviCsRptInfoGet(1, &info), SA_ERR_HPI_INVALID_DOMAIN, "Invalid Domain Id: 1"},
        {kviCsRptActiveEntryGetByRid(0, 42, nullptr, nullptr, nullptr, nullptr, nullptr),
         SA_ERR_HPI_NOT_PRESENT, "Unable to recover RPTEntryContainer.  Returned -1013"},
    };
    for (auto [rc, expected, line] : cases) {
        EXPECT_EQ(rc, expected) << line;
        EXPECT_TRUE(log.contains(line)) << line;
    }
    EXPECT_EQ(walkRpt(), (Ids{1}));
}

TEST_F(RptTest, RemovalCallsThePluginOnceAfterTheRecordsAreGoneEvenWhenItFails)
{
    int user = 0;
    SaHpiResourceIdT id = addResource(SAHPI_FALSE, kTestMapl, recordingTable(), &user);
    KviDsRdrFnTable rdrTable{};
    rdrTable.RdrResourcesRemove = [](SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiRdrT *, void *,
                                     KviDsRdrFnTable *) {
        removals.push_back("R" + std::to_string(Rid));
        return SA_OK;
    };
    addRdr(id, SAHPI_SENSOR_RDR, rdrTable);
    addRdr(id, SAHPI_CTRL_RDR, rdrTable);
    ASSERT_EQ(kviCsRptEntryRemoveByRid(0, id), SA_OK);
    EXPECT_EQ(removals, (std::vector<std::string>{"R1", "R1", "P1"}));
    EXPECT_EQ(removedUser, &user);
    EXPECT_EQ(removedActive, SAHPI_FALSE);
    EXPECT_EQ(kviCsRptEntryRemoveByRid(0, id), SA_ERR_HPI_NOT_PRESENT);

    id = addResource(SAHPI_TRUE, kTestMapl, recordingTable());
    rptRemovalResult = SA_ERR_HPI_ERROR;
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM);
    EXPECT_EQ(kviCsRptEntryRemoveByRid(0, id), SA_ERR_HPI_UNKNOWN);
    EXPECT_TRUE(log.contains("RptEntryResourcesRemove failed with rc=-1001; continuing"));
    EXPECT_TRUE(log.contains("errorsFound"));
    EXPECT_EQ(removals.size(), 4u);
    EXPECT_TRUE(walkRpt().empty());
}

TEST_F(RptTest, RemovingAPluginsEntriesTakesConsecutiveOnesToo)
{
    // Walk order 5, 1, 6, 2, 7, 3, 4: entries 5 and 1, then 2 and 7 stand
    // next to each other, and so do 4 at the end and 5 at the start.
    for (SaHpiResourceIdT id = 1; id <= 7; id++)
        addResource(SAHPI_TRUE, id == 3 || id == 6 ? kOtherMapl : kTestMapl, recordingTable(),
                    nullptr, id == 3 || id == 6 ? otherLock() : testLock());
    ASSERT_EQ(kviCsRptEntrysRemoveByMapl(0, kTestMapl), SA_OK);
    EXPECT_EQ(walkRpt(), (Ids{6, 3}));
    EXPECT_EQ(removals, (std::vector<std::string>{"P5", "P1", "P2", "P7", "P4"}));
    ASSERT_EQ(kviCsRptEntrysRemoveByLock(0, otherLock()), SA_OK);
    EXPECT_TRUE(walkRpt().empty());
    EXPECT_EQ(kviCsRptEntrysRemoveByMapl(0, kTestMapl), SA_OK);
}

TEST_F(RptTest, AFailureWhileUnloadingAPluginEndsTheProcess)
{
    addResource(SAHPI_TRUE, kOtherMapl, recordingTable());
    rptRemovalResult = SA_ERR_HPI_ERROR;
    expectFatalExit([] { kviCsRptEntrysRemoveByMapl(0, kOtherMapl); },
                    "Unable to unload an entry.  MaplNum(8) DomainId(0) ResourceId(1)");
    rptRemovalResult = SA_OK;
}

TEST_F(RptTest, AHeldTableMakesOtherCallsBusy)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    withRpt([](KviCsRptContainerT *) {
        SaHpiRptInfoT info{};
        auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(kviCsRptInfoGet(0, &info), SA_ERR_HPI_BUSY);
        EXPECT_GE(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(4900));
    });
    EXPECT_TRUE(log.contains("Unable to wait on semaphore, returned -1006"));
    EXPECT_TRUE(log.contains("kviCsRprLockRpt returned busy"));
}

} // namespace
