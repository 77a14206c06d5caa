#include <gtest/gtest.h>

#include "core/SaHpi/rpt/RptTestSupport.h"
#include "support/KviTestSupport.h"

namespace
{
class DefaultRemovalSlotsTest : public ResourceModelTest
{
};

TEST_F(DefaultRemovalSlotsTest, FreeTheUserBlockAndLogTheResource)
{
    SaHpiInt32T blocks = liveBlocks();
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_IN_NUM);
    EXPECT_EQ(kviDsDefaultRptResourcesRemove(0, 5, nullptr, KVI_CS_MALLOC(16), SAHPI_TRUE,
                                             nullptr),
              SA_OK);
    EXPECT_EQ(kviDsDefaultRdrResourcesRemove(0, 6, nullptr, KVI_CS_MALLOC(16), nullptr), SA_OK);
    EXPECT_EQ(liveBlocks(), blocks);
    EXPECT_TRUE(log.contains("domain=0, rid=5, Active=1"));
    EXPECT_TRUE(log.contains("domain=0, rid=6"));
    // Nothing hung on the resource: nothing to free, and no complaint.
    log.clear();
    EXPECT_EQ(kviDsDefaultRptResourcesRemove(0, 5, nullptr, nullptr, SAHPI_FALSE, nullptr), SA_OK);
    EXPECT_EQ(kviDsDefaultRdrResourcesRemove(0, 6, nullptr, nullptr, nullptr), SA_OK);
    EXPECT_FALSE(log.contains("Ptr is NULL."));
}

TEST_F(DefaultRemovalSlotsTest, ServeAsThePluginsSlotsWhenTheTableGoes)
{
    KviDsRptFnTable rptTable{};
    rptTable.RptEntryResourcesRemove = kviDsDefaultRptResourcesRemove;
    KviDsRdrFnTable rdrTable{};
    rdrTable.RdrResourcesRemove = kviDsDefaultRdrResourcesRemove;
    SaHpiResourceIdT id = addResource(SAHPI_FALSE, kTestMapl, rptTable, KVI_CS_MALLOC(32));
    addRdr(id, SAHPI_CTRL_RDR, rdrTable, KVI_CS_MALLOC(8));
    addRdr(id, SAHPI_SENSOR_RDR, rdrTable, nullptr);
    // The fixture checks that every block is back once the table is empty.
}

} // namespace
