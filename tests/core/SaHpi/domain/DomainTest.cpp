#include <gtest/gtest.h>

#include "KviDaemonCore.h"
#include "support/KviTestSupport.h"

namespace
{
// Runs first: the domain is set up once per process and never torn down.
TEST(DomainTest, SetsUpTheTableOnceAndRefusesLookupsBeforeAndOfOtherDomains)
{
    KviCsRptContainerT *rpt = nullptr;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsGetRptContainerByDomainId(0, &rpt), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Call made to get container before initialization."));

    ASSERT_EQ(kviCsDomainInitialize(), SA_OK);
    ASSERT_EQ(kviCsGetRptContainerByDomainId(0, &rpt), SA_OK);
    EXPECT_EQ(rpt->HashSize, static_cast<SaHpiUint32T>(KVI_CS_DEFAULT_RPT_HASH_SIZE));
    EXPECT_EQ(rpt->LastResourceId, 1u);
    EXPECT_EQ(rpt->RptInfo.UpdateCount, 0u);
    EXPECT_EQ(rpt->RptInfo.UpdateTimestamp, SAHPI_TIME_UNSPECIFIED);
    for (SaHpiUint32T i = 0; i < rpt->HashSize; i++)
        EXPECT_EQ(rpt->RptEntryList[i].HeadPointer, nullptr);
    EXPECT_EQ(kviCsDomainInitialize(), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(log.contains("Duplicate call!"));
    KviCsRptContainerT *again = nullptr;
    ASSERT_EQ(kviCsRptGetRptContainer(0, &again), SA_OK);
    EXPECT_EQ(again, rpt);

    EXPECT_EQ(kviCsGetRptContainerByDomainId(1, &again), SA_ERR_HPI_INVALID_DOMAIN);
    EXPECT_TRUE(log.contains("Invalid Domain Id: 1"));
    EXPECT_EQ(kviCsGetRptContainerByDomainId(0, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("RptContainer pointer is NULL."));
}

TEST(DomainTest, DomainListIsAlwaysTheDefaultDomain)
{
    SaHpiDomainIdT list[3] = {7, 7, 7};
    SaHpiUint32T count = 0;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsGetDomainList(0, list, &count), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_EQ(count, 1u) << "the size needed is reported";
    EXPECT_EQ(list[0], 7u);
    EXPECT_TRUE(log.contains("ListSize is too small 0<1"));
    ASSERT_EQ(kviCsGetDomainList(3, list, &count), SA_OK);
    EXPECT_EQ(count, 1u);
    EXPECT_EQ(list[0], SAHPI_DEFAULT_DOMAIN_ID);
    EXPECT_EQ(list[1], 7u);
    EXPECT_EQ(kviCsGetDomainList(3, nullptr, &count), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsGetDomainList(3, list, nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

} // namespace
