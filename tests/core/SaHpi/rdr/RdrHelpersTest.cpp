#include <string>

#include "core/SaHpi/rpt/RptTestSupport.h"

namespace
{
Ids cleaned;
SaErrorT cleanupResult = SA_OK;

SaErrorT recordCleanup(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *Rdr, void *, KviDsRdrFnTable *)
{
    cleaned.push_back(Rdr->RecordId);
    return cleanupResult;
}

// A resource with records 1 to 5 (walked 3, 1, 4, 2, 5), each with a
// recording cleanup except 4.
class RdrHelpersTest : public ResourceModelTest
{
  protected:
    void SetUp() override
    {
        ResourceModelTest::SetUp();
        cleaned.clear();
        cleanupResult = SA_OK;
        rid_ = addResource(SAHPI_FALSE);
        KviDsRdrFnTable table{};
        table.RdrResourcesRemove = recordCleanup;
        for (SaHpiEntryIdT id = 1; id <= 5; id++)
            addRdr(rid_, SAHPI_SENSOR_RDR, id == 4 ? KviDsRdrFnTable{} : table);
    }
    SaHpiResourceIdT rid_ = 0;

    static Ids walk(KviCsRdrRepositoryContainerT *Repo)
    {
        Ids ids;
        SaHpiEntryIdT next = SAHPI_FIRST_ENTRY;
        while (kviCsRdrGetNextEntry(Repo, next, &next) == SA_OK && next != SAHPI_LAST_ENTRY)
            ids.push_back(next);
        return ids;
    }
};

TEST_F(RdrHelpersTest, WalkRefusesTheLastEntryAndFindsNothingInAnEmptyRepository)
{
    withRepository(rid_, [](KviCsRdrRepositoryContainerT *repo) {
        SaHpiEntryIdT next = 0;
        EXPECT_EQ(walk(repo), (Ids{3, 1, 4, 2, 5}));
        EXPECT_EQ(kviCsRdrGetNextEntry(repo, SAHPI_LAST_ENTRY, &next), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsRdrGetNextEntry(repo, 8, &next), SA_ERR_HPI_NOT_PRESENT);
    });
    withRepository(addResource(SAHPI_FALSE), [](KviCsRdrRepositoryContainerT *repo) {
        SaHpiEntryIdT next = 0;
        EXPECT_EQ(kviCsRdrGetNextEntry(repo, SAHPI_FIRST_ENTRY, &next), SA_ERR_HPI_INVALID_REQUEST);
    });
}

TEST_F(RdrHelpersTest, RemovingOneRecordCallsItsCleanupIfItHasOne)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    withRepository(rid_, [this, &log](KviCsRdrRepositoryContainerT *repo) {
        EXPECT_EQ(kviCsRdrGivenRepositoryRemoveEntry(0, rid_, repo, SAHPI_LAST_ENTRY),
                  SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_TRUE(log.contains("EntryId can't be SAHPI_LAST_ENTRY"));
        EXPECT_EQ(kviCsRdrGivenRepositoryRemoveEntry(0, rid_, repo, 9), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_TRUE(log.contains("Request to remove entry 9, but can't find that entry"));

        // The first of the walk, then one by id, then one without cleanup.
        for (SaHpiEntryIdT id : Ids{SAHPI_FIRST_ENTRY, 2, 4})
            ASSERT_EQ(kviCsRdrGivenRepositoryRemoveEntry(0, rid_, repo, id), SA_OK);
        EXPECT_TRUE(log.contains("Calling RdrResourcesRemove function pointer"));
        EXPECT_TRUE(log.contains("Function Pointer is NULL, no user function to call"));
        EXPECT_EQ(cleaned, (Ids{3, 2}));
        EXPECT_EQ(walk(repo), (Ids{1, 5}));

        cleanupResult = SA_ERR_HPI_ERROR;
        ASSERT_EQ(kviCsRdrGivenRepositoryRemoveEntry(0, rid_, repo, 5), SA_OK);
        EXPECT_TRUE(log.contains("User Cleanup returned -1001 for resource " +
                                 std::to_string(rid_) + ", record 5"));
        EXPECT_EQ(walk(repo), (Ids{1}));
    });
}

TEST_F(RdrHelpersTest, RepositoryIsOneBlockOfListsAndItsAllocationCanFail)
{
    SaHpiInt32T blocks = liveBlocks();
    KviCsRdrRepositoryContainerT repo{};
    ASSERT_EQ(kviCsRdrRepositoryContainerInitialize(&repo), SA_OK);
    EXPECT_EQ(repo.HashSize, 3u);
    EXPECT_EQ(repo.NextRecordId, 1u);
    EXPECT_EQ(liveBlocks(), blocks + 1);
    ASSERT_EQ(kviCsRdrRepositoryRemove(0, 1, &repo), SA_OK);
    EXPECT_EQ(liveBlocks(), blocks);

    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsRdrRepositoryContainerInitialize(&repo), SA_ERR_HPI_OUT_OF_SPACE);
    kviCsMemoryFailNthAllocation(0);
    EXPECT_TRUE(log.contains("Unable to allocate memory for the RDR's linked list"));
    EXPECT_EQ(liveBlocks(), blocks);
}

TEST_F(RdrHelpersTest, RemovingTheRepositoryCleansEveryRecordOnce)
{
    withRepository(rid_, [this](KviCsRdrRepositoryContainerT *repo) {
        cleanupResult = SA_ERR_HPI_ERROR; // a plug-in's failure does not stop the removal
        ASSERT_EQ(kviCsRdrRepositoryRemove(0, rid_, repo), SA_OK);
        EXPECT_EQ(cleaned, (Ids{3, 1, 2, 5}));
        EXPECT_EQ(repo->RdrList, nullptr);
    });
    // The emptied resource goes without calling anything again.
    cleaned.clear();
    withRpt([this](KviCsRptContainerT *rpt) {
        EXPECT_EQ(kviCsRptEntryRemoveByRidNoLock(0, rid_, rpt), SA_OK);
    });
    EXPECT_TRUE(cleaned.empty());
}

} // namespace
