#include "core/SaHpi/rpt/RptTestSupport.h"

namespace
{
class RptHelpersTest : public ResourceModelTest
{
};

TEST_F(RptHelpersTest, WalkStepsAndItsRefusals)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    withRpt([](KviCsRptContainerT *rpt) {
        SaHpiEntryIdT next = 0;
        SaHpiBoolT active = SAHPI_FALSE;
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, SAHPI_FIRST_ENTRY, &next, &active),
                  SA_ERR_HPI_INVALID_REQUEST);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, 3, &next, &active), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, SAHPI_LAST_ENTRY, &next, &active),
                  SA_ERR_HPI_INVALID_PARAMS);
        for (SaErrorT rc : {kviCsRptGetNextEntry(nullptr, 1, &next, &active),
                            kviCsRptGetNextEntry(rpt, 1, nullptr, &active),
                            kviCsRptGetNextEntry(rpt, 1, &next, nullptr)})
            EXPECT_EQ(rc, SA_ERR_HPI_INVALID_PARAMS);
    });
    for (const char *line :
         {"No entries found.", "No entries in the list where CurrentEntry should exist.",
          "Invalid value for CurrentEntry (0xffffffff)"})
        EXPECT_TRUE(log.contains(line)) << line;

    addResource(SAHPI_FALSE); // 1
    addResource(SAHPI_TRUE);  // 2
    withRpt([&log](KviCsRptContainerT *rpt) {
        SaHpiEntryIdT next = 0;
        SaHpiBoolT active = SAHPI_TRUE;
        ASSERT_EQ(kviCsRptGetNextEntry(rpt, SAHPI_FIRST_ENTRY, &next, &active), SA_OK);
        EXPECT_EQ(next, 1u);
        EXPECT_FALSE(active);
        EXPECT_EQ(kviCsRptGetNextEntry(rpt, 6, &next, &active), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_TRUE(log.contains("Didn't find our record in the list"));
        ASSERT_EQ(kviCsRptGetNextEntry(rpt, 2, &next, &active), SA_OK);
        EXPECT_EQ(next, SAHPI_LAST_ENTRY);
        EXPECT_TRUE(active) << "the end of the walk reads as active";
    });
}

TEST_F(RptHelpersTest, GeneratorSkipsIdsStillInUseAndTheUnusableOnesAfterAWrap)
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
    });
}

// The generator tells a free id from a broken lookup by the node lookup's
// SA_ERR_HPI_INVALID_RESOURCE; the others report SA_ERR_HPI_NOT_PRESENT.
TEST_F(RptHelpersTest, LookupsReportMissingIdsEachInTheirOwnWay)
{
    addResource(SAHPI_TRUE);
    withRpt([](KviCsRptContainerT *rpt) {
        KviCsLinkedListNodeT *node = nullptr;
        KviCsRptEntryContainerT *entry = nullptr;
        EXPECT_EQ(kviCsRptGetNode(rpt, 6, &node), SA_ERR_HPI_INVALID_RESOURCE);
        EXPECT_EQ(kviCsRptGetNodeFromLinkedList(&rpt->RptEntryList[1], 6, &node),
                  SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviCsRptGetRptEntryContainer(rpt, 6, &entry), SA_ERR_HPI_NOT_PRESENT);
        EXPECT_EQ(kviCsRptEntryRemoveByRidNoLock(0, 6, rpt), SA_ERR_HPI_NOT_PRESENT);
        ASSERT_EQ(kviCsRptGetRptEntryContainer(rpt, 1, &entry), SA_OK);
        EXPECT_EQ(entry->MaplNum, kTestMapl);
        ASSERT_EQ(kviCsRptGetNode(rpt, 1, &node), SA_OK);
        EXPECT_EQ(node->Data, entry);
    });
}

TEST_F(RptHelpersTest, UnlockingATableThatIsNotLockedEndsTheProcess)
{
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsGetRptContainerByDomainId(0, &rpt), SA_OK);
    expectFatalExit([rpt] { kviCsRptUnlockRpt(rpt); },
                    "Tried to unlock RPT twice.  The source code is broken.  Bailing.");
    expectFatalExit([] { kviCsRptUnlockRpt(nullptr); }, "Can't unlock RPT.  Bailing.");
    // The table is still usable here: the checks ran in the children.
    withRpt([](KviCsRptContainerT *) {});
}

} // namespace
