#include <gtest/gtest.h>

#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
TEST(Memory, CountFollowsMallocFreeAndRealloc)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_MEM_NUM);
    SaHpiInt32T base = kviTestLiveBlocks();
    EXPECT_EQ(KVI_CS_MALLOC(0), nullptr);
    EXPECT_TRUE(log.contains("Can't malloc size 0"));
    EXPECT_EQ(kviTestLiveBlocks(), base);

    void *p = KVI_CS_REALLOC(nullptr, 16);
    ASSERT_NE(p, nullptr);
    EXPECT_EQ(kviTestLiveBlocks(), base + 1);
    p = KVI_CS_REALLOC(p, 4096);
    ASSERT_NE(p, nullptr);
    EXPECT_EQ(kviTestLiveBlocks(), base + 1);
    EXPECT_TRUE(log.contains("ReallocOld: "));
    EXPECT_EQ(KVI_CS_REALLOC(p, 0), nullptr);
    EXPECT_EQ(kviTestLiveBlocks(), base);
    EXPECT_EQ(KVI_CS_REALLOC(nullptr, 0), nullptr);
    EXPECT_TRUE(log.contains("Changing size of NULL to 0?"));

    void *q = KVI_CS_MALLOC(8);
    EXPECT_TRUE(log.contains("Malloc: "));
    EXPECT_EQ(KVI_CS_FREE(q), SA_OK);
    EXPECT_EQ(q, nullptr); // the macro clears the caller's pointer
    EXPECT_EQ(KVI_CS_FREE(q), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Ptr is NULL. "));
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(Memory, BadCallerPositionIsRefused)
{
    KviLogCapture log;
    SaHpiInt32T base = kviTestLiveBlocks();
    int x = 0;
    EXPECT_EQ(kviCsMalloc(nullptr, "f", 1, 8), nullptr);
    EXPECT_EQ(kviCsMalloc("f", nullptr, 1, 8), nullptr);
    EXPECT_EQ(kviCsMalloc("f", "f", 1, -5), nullptr);
    EXPECT_EQ(kviCsFree(nullptr, "f", 1, &x), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsFree("f", nullptr, 1, &x), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsGetMemorySegmentsAllocated(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("File parameter is NULL"));
    EXPECT_TRUE(log.contains("Function pointer is NULL."));
    EXPECT_TRUE(log.contains("Segments pointer is NULL."));
    EXPECT_EQ(kviTestLiveBlocks(), base);
}

TEST(Memory, FailureHookFailsExactlyTheNthAllocation)
{
    KviLogCapture log;
    SaHpiInt32T base = kviTestLiveBlocks();
    kviCsMemoryFailNthAllocation(2);
    void *first = KVI_CS_MALLOC(8);
    void *second = KVI_CS_MALLOC(8);
    void *third = KVI_CS_MALLOC(8);
    EXPECT_NE(first, nullptr);
    EXPECT_EQ(second, nullptr);
    EXPECT_NE(third, nullptr);
    EXPECT_TRUE(log.contains("Malloc call failed"));

    kviCsMemoryFailNthAllocation(1);
    void *kept = first;
    EXPECT_EQ(KVI_CS_REALLOC(first, 64), nullptr); // the old block stays valid
    EXPECT_TRUE(log.contains("Realloc call failed"));
    KVI_CS_FREE(kept);
    KVI_CS_FREE(third);
    EXPECT_EQ(kviTestLiveBlocks(), base);
}
} // namespace
