#include <gtest/gtest.h>

#include <vector>

#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
struct ListFixture : testing::Test {
    KviCsLinkedListT list{};
    KviCsLinkedListNodeT nodes[4]{};
    void SetUp() override { ASSERT_EQ(kviCsLinkedListInitialize(&list), SA_OK); }
    std::vector<KviCsLinkedListNodeT *> forward()
    {
        std::vector<KviCsLinkedListNodeT *> out;
        for (auto *n = list.HeadPointer; n != nullptr && out.size() < 10; n = n->Next)
            out.push_back(n);
        return out;
    }
};

TEST_F(ListFixture, RemovingTheMiddleJoinsItsNeighbours)
{
    for (int i = 0; i < 3; ++i)
        ASSERT_EQ(kviCsLinkedListAddToTail(&list, &nodes[i]), SA_OK);
    ASSERT_EQ(kviCsLinkedListRemoveNode(&nodes[1]), SA_OK);
    EXPECT_EQ(forward(), (std::vector<KviCsLinkedListNodeT *>{&nodes[0], &nodes[2]}));
    EXPECT_EQ(nodes[0].Next, &nodes[2]);
    EXPECT_EQ(nodes[2].Previous, &nodes[0]);
    EXPECT_EQ(nodes[1].LinkedList, nullptr);
    EXPECT_EQ(nodes[1].Next, nullptr);
    EXPECT_EQ(nodes[1].Previous, nullptr);

    ASSERT_EQ(kviCsLinkedListAddToHead(&list, &nodes[3]), SA_OK);
    EXPECT_EQ(forward(), (std::vector<KviCsLinkedListNodeT *>{&nodes[3], &nodes[0], &nodes[2]}));
    for (auto *n : {&nodes[3], &nodes[2], &nodes[0]})
        ASSERT_EQ(kviCsLinkedListRemoveNode(n), SA_OK);
    EXPECT_EQ(list.HeadPointer, nullptr);
    EXPECT_EQ(list.TailPointer, nullptr);
}

TEST_F(ListFixture, InconsistentEndsAreRepairedAndReported)
{
    KviLogCapture log;
    ASSERT_EQ(kviCsLinkedListAddToTail(&list, &nodes[0]), SA_OK);
    list.TailPointer = nullptr; // damaged: head set, tail lost
    ASSERT_EQ(kviCsLinkedListAddToTail(&list, &nodes[1]), SA_OK);
    EXPECT_EQ(forward(), std::vector<KviCsLinkedListNodeT *>{&nodes[1]});
    EXPECT_TRUE(log.contains("TailPointer is NULL, but HeadPointer isn't."));

    list.HeadPointer = nullptr; // damaged the other way
    ASSERT_EQ(kviCsLinkedListAddToHead(&list, &nodes[2]), SA_OK);
    EXPECT_EQ(forward(), std::vector<KviCsLinkedListNodeT *>{&nodes[2]});
    EXPECT_EQ(list.TailPointer, &nodes[2]);
    EXPECT_TRUE(log.contains("Head Pointer is NULL, but Tail Pointer isn't."));

    // A head whose successor is missing means the tail pointer is spurious.
    ASSERT_EQ(kviCsLinkedListAddToTail(&list, &nodes[3]), SA_OK);
    nodes[2].Next = nullptr;
    ASSERT_EQ(kviCsLinkedListRemoveNode(&nodes[2]), SA_OK);
    EXPECT_EQ(list.HeadPointer, nullptr);
    EXPECT_EQ(list.TailPointer, nullptr);
    EXPECT_TRUE(log.contains("Apparent Spurrious Tail Pointer, cleaning list, may leak memory."));
}

TEST_F(ListFixture, BrokenMiddleNodeIsLeftAlone)
{
    KviLogCapture log;
    for (int i = 0; i < 3; ++i)
        ASSERT_EQ(kviCsLinkedListAddToTail(&list, &nodes[i]), SA_OK);
    nodes[1].Next = nullptr;
    EXPECT_EQ(kviCsLinkedListRemoveNode(&nodes[1]), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Cannot remove node in middle of list-- Next is NULL."));
    EXPECT_EQ(nodes[1].LinkedList, &list);
    EXPECT_EQ(list.HeadPointer, &nodes[0]);
    EXPECT_EQ(list.TailPointer, &nodes[2]);
}

TEST_F(ListFixture, OnlyElementWithStrayLinksIsStillRemoved)
{
    KviLogCapture log;
    ASSERT_EQ(kviCsLinkedListAddToTail(&list, &nodes[0]), SA_OK);
    nodes[0].Next = &nodes[1];
    ASSERT_EQ(kviCsLinkedListRemoveNode(&nodes[0]), SA_OK);
    EXPECT_TRUE(log.contains("doesn't think it's last."));
    EXPECT_EQ(list.HeadPointer, nullptr);
    EXPECT_EQ(nodes[0].LinkedList, nullptr);
}

TEST_F(ListFixture, BadArgumentsAreRefused)
{
    KviLogCapture log;
    KviCsLinkedListNodeT loose{};
    EXPECT_EQ(kviCsLinkedListInitialize(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLinkedListAddToHead(nullptr, &loose), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLinkedListAddToTail(&list, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLinkedListRemoveNode(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLinkedListRemoveNode(&loose), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLinkedListNodeMalloc(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("NodeToRemove->LinkedList == NULL"));
    EXPECT_TRUE(log.contains("Null passed in for Node"));
}

TEST(LinkedListMemory, NodeMallocReportsOutOfSpace)
{
    KviLogCapture log;
    SaHpiInt32T base = kviTestLiveBlocks();
    KviCsLinkedListNodeT *node = nullptr;
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsLinkedListNodeMalloc(&node), SA_ERR_HPI_OUT_OF_SPACE);
    EXPECT_TRUE(log.contains("KVI_CS_MALLOC failed"));
    ASSERT_EQ(kviCsLinkedListNodeMalloc(&node), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), base + 1);
    EXPECT_EQ(kviCsLinkedListNodeFree(node), SA_OK);
    EXPECT_EQ(kviTestLiveBlocks(), base);
    EXPECT_EQ(kviCsLinkedListNodeFree(nullptr), SA_OK);
    EXPECT_TRUE(log.contains("Ptr is NULL."));
    EXPECT_EQ(kviTestLiveBlocks(), base);
}
} // namespace
