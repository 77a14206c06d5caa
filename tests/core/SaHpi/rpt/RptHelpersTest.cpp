#include <gtest/gtest.h>

#include "core/SaHpi/rpt/RptTestSupport.h"
#include "support/KviTestSupport.h"

namespace
{
// Runs Body with the table held, as the helpers require.
template <typename Body> void withRpt(Body body)
{
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    body(rpt);
    kviCsRptUnlockRpt(rpt);
}

class RptHelpersTest : public ResourceModelTest
{
};

TEST_F(RptHelpersTest, WalkStepsAndItsRefusals)
{
    withRpt([](KviCsRptContainerT *rpt) {
        SaHpiEntryIdT next = 0;
        SaHpiBoolT active = SAHPI_FALSE;
        KviLogCapture log(KVI_LOG_DBG_L_NUM);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, SAHPI_FIRST_ENTRY, &next, &active),
                  SA_ERR_HPI_INVALID_REQUEST);
        EXPECT_TRUE(log.contains("No entries found."));
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, 3, &next, &active), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_TRUE(log.contains("No entries in the list where CurrentEntry should exist."));
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, SAHPI_LAST_ENTRY, &next, &active),
                  SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_TRUE(log.contains("Invalid value for CurrentEntry (0xffffffff)"));
        EXPECT_EQ(kviCsRptGetNextEntry(nullptr, 1, &next, &active), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, 1, nullptr, &active), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, 1, &next, nullptr), SA_ERR_HPI_INVALID_PARAMS);
        for (const char *line : {"RptContainerToSearch pointer is NULL.",
                                 "NextEntry pointer is NULL.", "Active pointer is NULL."})
            EXPECT_TRUE(log.contains(line)) << line;
    });

    addResource(SAHPI_FALSE); // 1
    addResource(SAHPI_TRUE);  // 2
    withRpt([](KviCsRptContainerT *rpt) {
        SaHpiEntryIdT next = 0;
        SaHpiBoolT active = SAHPI_TRUE;
        ASSERT_EQ(kviCsRptGetNextEntry(rpt, SAHPI_FIRST_ENTRY, &next, &active), SA_OK);
        EXPECT_EQ(next, 1u);
        EXPECT_FALSE(active);
        KviLogCapture log(KVI_LOG_DBG_L_NUM);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, 6, &next, &active), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_TRUE(log.contains("Didn't find our record in the list"));
        ASSERT_EQ(kviCsRptGetNextEntry(rpt, 2, &next, &active), SA_OK);
        EXPECT_EQ(next, SAHPI_LAST_ENTRY);
        EXPECT_TRUE(active) << "the end of the walk reads as active";
    });
}

TEST_F(RptHelpersTest, GeneratorSkipsIdsStillInUse)
{
    addResource(SAHPI_TRUE); // 1
    addResource(SAHPI_TRUE); // 2
    setNextResourceId(1);
    withRpt([](KviCsRptContainerT *rpt) {
        SaHpiResourceIdT id = 0;
        ASSERT_EQ(kviCsRptGenerateResourceId(rpt, &id), SA_OK);
        EXPECT_EQ(id, 3u);
        EXPECT_EQ(rpt->LastResourceId, 4u);
        rpt->LastResourceId = 0xFFFFFFFF;
        ASSERT_EQ(kviCsRptGenerateResourceId(rpt, &id), SA_OK);
        EXPECT_EQ(id, 3u) << "0xFFFFFFFF, 0, 1 and 2 are passed over";
        EXPECT_EQ(kviCsRptGenerateResourceId(nullptr, &id), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsRptGenerateResourceId(rpt, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    });
}

TEST_F(RptHelpersTest, LookupsReportMissingIdsEachInTheirOwnWay)
{
    addResource(SAHPI_TRUE);
    withRpt([](KviCsRptContainerT *rpt) {
        KviCsLinkedListNodeT *node = nullptr;
        KviCsRptEntryContainerT *entry = nullptr;
        // The generator relies on a missing node being an invalid resource.
        EXPECT_EQ(kviCsRptGetNode(rpt, 6, &node), SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptGetNodeFromLinkedList(&rpt->RptEntryList[1], 6, &node),
                  SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviCsRptGetRptEntryContainer(rpt, 6, &entry), SA_ERR_HPI_NOT_PRESENT);
        ASSERT_EQ(kviCsRptGetRptEntryContainer(rpt, 1, &entry), SA_OK);
        EXPECT_EQ(entry->MaplNum, kTestMapl);
        ASSERT_EQ(kviCsRptGetNode(rpt, 1, &node), SA_OK);
        EXPECT_EQ(node->Data, entry);
        EXPECT_EQ(kviCsRptEntryRemoveByRidNoLock(SAHPI_DEFAULT_DOMAIN_ID, 6, rpt),
                  SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviCsRptEntryRemoveByRidNoLock(SAHPI_DEFAULT_DOMAIN_ID, 1, nullptr),
                  SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsRptGetRptEntryContainer(rpt, 1, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    });
}

TEST_F(RptHelpersTest, UpdateInfoCountsAndStampsTheTime)
{
    SaHpiRptInfoT info{};
    info.UpdateCount = 41;
    info.UpdateTimestamp = SAHPI_TIME_UNSPECIFIED;
    ASSERT_EQ(kviCsRptUpdateInfo(&info), SA_OK);
    EXPECT_EQ(info.UpdateCount, 42u);
    EXPECT_GT(info.UpdateTimestamp, 0);
    EXPECT_EQ(kviCsRptUpdateInfo(nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

TEST_F(RptHelpersTest, LockIsForTheDefaultDomainOnly)
{
    KviCsRptContainerT *rpt = nullptr;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsRptLockRpt(3, &rpt), SA_ERR_HPI_INVALID_DOMAIN);
    EXPECT_TRUE(log.contains("Unable to get the rpt container, returned -1022"));
    EXPECT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    kviCsRptUnlockRpt(rpt);
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK) << "the unlock released it";
    kviCsRptUnlockRpt(rpt);
}

TEST_F(RptHelpersTest, UnlockingATableThatIsNotLockedEndsTheProcess)
{
    KviCsRptContainerT *rpt = rptContainer();
    expectFatalExit([rpt] { kviCsRptUnlockRpt(rpt); },
                    "Tried to unlock RPT twice.  The source code is broken.  Bailing.");
    expectFatalExit([] { kviCsRptUnlockRpt(nullptr); }, "Can't unlock RPT.  Bailing.");
    // The table is still usable here: the checks ran in the children.
    KviCsRptContainerT *held = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &held), SA_OK);
    kviCsRptUnlockRpt(held);
}

} // namespace
