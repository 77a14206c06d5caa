// The intrusive doubly linked list every table is built of. Inconsistent end
// pointers are repaired and reported rather than followed into a crash: a
// damaged list may leak, but the daemon keeps running.
#include "core/utils/KviTrace.h"
#include "kvi/KviMemory.h"

namespace
{
void detach(KviCsLinkedListNodeT *node)
{
    node->LinkedList = nullptr;
    node->Previous = nullptr;
    node->Next = nullptr;
}

void makeOnlyElement(KviCsLinkedListT *list, KviCsLinkedListNodeT *node)
{
    list->HeadPointer = node;
    list->TailPointer = node;
    node->Previous = nullptr;
    node->Next = nullptr;
    node->LinkedList = list;
}

void makeEmpty(KviCsLinkedListT *list)
{
    list->HeadPointer = nullptr;
    list->TailPointer = nullptr;
}

SaErrorT removeOnlyElement(KviCsLinkedListNodeT *node)
{
    if (node->Next != nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Linked list thinks NodeToRemove is only element in the list, but NodeToRemove "
                 "doesn't think it's last. Ignoring NodeToRemove-- may indicate memory leak");
        node->Next = nullptr;
    }
    if (node->Previous != nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Linked list thinks NodeToRemove is only element in the list, but NodeToRemove "
                 "doesn't think it's first. Ignoring NodeToRemove-- may indicate memory leak");
        node->Previous = nullptr;
    }
    makeEmpty(node->LinkedList);
    node->LinkedList = nullptr;
    return SA_OK;
}

// Removes the head or the tail of a list with more than one element; a
// missing neighbour means the list's other end pointer is spurious.
SaErrorT removeEnd(KviCsLinkedListNodeT *node, KviFunctionTrace &trace, bool head)
{
    KviCsLinkedListT *list = node->LinkedList;
    KviCsLinkedListNodeT *neighbour = head ? node->Next : node->Previous;
    if (neighbour == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 head ? "Apparent Spurrious Tail Pointer, cleaning list, may leak memory."
                      : "Apparent Spurrious Head Pointer, cleaning list, may leak memory.");
        makeEmpty(list);
        detach(node);
        trace.exitMessage("Problems fixed");
        return SA_OK;
    }
    if (head) {
        list->HeadPointer = neighbour;
        neighbour->Previous = nullptr;
    } else {
        list->TailPointer = neighbour;
        neighbour->Next = nullptr;
    }
    detach(node);
    return SA_OK;
}
// Adds at the head or the tail. Emptiness is judged by the end being added
// to; a stray pointer at the other end is dropped with a warning.
SaErrorT addAtEnd(KviCsLinkedListT *list, KviCsLinkedListNodeT *node, bool head)
{
    if (list == nullptr || node == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 list == nullptr ? "Parameter LinkedList == NULL" : "Parameter NodeToAdd == NULL");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviCsLinkedListNodeT *&near = head ? list->HeadPointer : list->TailPointer;
    KviCsLinkedListNodeT *far = head ? list->TailPointer : list->HeadPointer;
    if (near == nullptr) {
        if (far != nullptr)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                     head ? "Head Pointer is NULL, but Tail Pointer isn't. Recovering by "
                            "resetting tail to NULL"
                          : "TailPointer is NULL, but HeadPointer isn't. Recovering by setting "
                            "HeadPointer to NULL");
        makeOnlyElement(list, node);
        return SA_OK;
    }
    node->LinkedList = list;
    (head ? node->Previous : node->Next) = nullptr;
    (head ? node->Next : node->Previous) = near;
    (head ? near->Previous : near->Next) = node;
    near = node;
    return SA_OK;
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsLinkedListInitialize(KviCsLinkedListT *LinkedList) noexcept
{
    KVI_TRACE("");
    if (LinkedList == nullptr) {
        KVI_WLOG(KVI_LOG_WARN, "Null parameter LinkedList");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    makeEmpty(LinkedList);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsLinkedListNodeMalloc(KviCsLinkedListNodeT **NodeToMalloc) noexcept
{
    KVI_TRACE("");
    if (NodeToMalloc == nullptr) {
        KVI_WLOG(KVI_LOG_WARN, "Null passed in for Node");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    *NodeToMalloc =
        static_cast<KviCsLinkedListNodeT *>(KVI_CS_MALLOC(sizeof(KviCsLinkedListNodeT)));
    if (*NodeToMalloc == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_MALLOC failed");
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsLinkedListNodeFree(KviCsLinkedListNodeT *NodeToFree) noexcept
{
    KVI_TRACE("");
    // A null node goes to the allocator too, whose line names the caller's
    // mistake; the free of nothing still succeeds.
    KVI_CS_FREE(NodeToFree);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsLinkedListAddToHead(KviCsLinkedListT *LinkedList,
                                             KviCsLinkedListNodeT *NodeToAdd) noexcept
{
    KVI_TRACE("");
    return addAtEnd(LinkedList, NodeToAdd, true);
}

KVI_EXPORT SaErrorT kviCsLinkedListAddToTail(KviCsLinkedListT *LinkedList,
                                             KviCsLinkedListNodeT *NodeToAdd) noexcept
{
    KVI_TRACE("");
    return addAtEnd(LinkedList, NodeToAdd, false);
}

KVI_EXPORT SaErrorT kviCsLinkedListRemoveNode(KviCsLinkedListNodeT *NodeToRemove) noexcept
{
    KVI_TRACE("");
    if (NodeToRemove == nullptr || NodeToRemove->LinkedList == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, NodeToRemove == nullptr
                                           ? "Parameter NodeToRemove == NULL"
                                           : "NodeToRemove->LinkedList == NULL");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KviCsLinkedListT *list = NodeToRemove->LinkedList;
    if (list->HeadPointer == nullptr || list->TailPointer == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "linkedList thinks it's empty, but we have a node for it. Setting linkedList to "
                 "empty & removing node. May indicate memory leak.");
        makeEmpty(list);
        detach(NodeToRemove);
        return SA_OK;
    }
    bool isHead = list->HeadPointer == NodeToRemove;
    bool isTail = list->TailPointer == NodeToRemove;
    if (isHead && isTail)
        return removeOnlyElement(NodeToRemove);
    if (isHead || isTail)
        return removeEnd(NodeToRemove, trace, isHead);
    if (NodeToRemove->Previous == nullptr || NodeToRemove->Next == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 NodeToRemove->Previous == nullptr
                     ? "Cannot remove node in middle of list-- Previous is NULL."
                     : "Cannot remove node in middle of list-- Next is NULL.");
        return SA_ERR_HPI_ERROR;
    }
    NodeToRemove->Previous->Next = NodeToRemove->Next;
    NodeToRemove->Next->Previous = NodeToRemove->Previous;
    detach(NodeToRemove);
    return SA_OK;
}

} // extern "C"
