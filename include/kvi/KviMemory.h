/* Accounted heap memory and the intrusive doubly linked list that every
 * table of the library is built of. */
#ifndef KVI_MEMORY_H
#define KVI_MEMORY_H

#include <stddef.h>

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

KVI_API void *kviCsMalloc(const char *File, const char *Function, SaHpiUint32T Line,
                          SaHpiInt32T Size) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsFree(const char *File, const char *Function, SaHpiUint32T Line,
                           void *Ptr) KVI_NOEXCEPT;
KVI_API void *kviCsRealloc(const char *File, const char *Function, SaHpiUint32T Line, void *Ptr,
                           SaHpiInt32T Size) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetMemorySegmentsAllocated(SaHpiInt32T *Segments) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsMemoryInitialize(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsMemoryFinalize(void) KVI_NOEXCEPT;

#define KVI_CS_MALLOC(Size) kviCsMalloc(__FILE__, __func__, __LINE__, (SaHpiInt32T)(Size))
#define KVI_CS_REALLOC(Ptr, Size)                                                                 \
    kviCsRealloc(__FILE__, __func__, __LINE__, (Ptr), (SaHpiInt32T)(Size))
/* Also clears the caller's variable so a freed block is never used again
 * through it. Evaluates to the result of kviCsFree. */
#define KVI_CS_FREE(Ptr)                                                                          \
    __extension__({                                                                               \
        SaErrorT kviFreeRc_ = kviCsFree(__FILE__, __func__, __LINE__, (void *)(Ptr));             \
        (Ptr) = NULL;                                                                             \
        kviFreeRc_;                                                                               \
    })

typedef struct __KviCsLinkedListNodeT KviCsLinkedListNodeT;

typedef struct __KviCsLinkedListT {
    KviCsLinkedListNodeT *HeadPointer;
    KviCsLinkedListNodeT *TailPointer;
    void *Data;
} KviCsLinkedListT;

struct __KviCsLinkedListNodeT {
    KviCsLinkedListT *LinkedList;
    KviCsLinkedListNodeT *Previous;
    KviCsLinkedListNodeT *Next;
    void *Data;
};

KVI_API SaErrorT kviCsLinkedListInitialize(KviCsLinkedListT *LinkedList) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLinkedListNodeMalloc(KviCsLinkedListNodeT **NodeToMalloc) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLinkedListNodeFree(KviCsLinkedListNodeT *NodeToFree) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLinkedListAddToHead(KviCsLinkedListT *LinkedList,
                                          KviCsLinkedListNodeT *NodeToAdd) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLinkedListAddToTail(KviCsLinkedListT *LinkedList,
                                          KviCsLinkedListNodeT *NodeToAdd) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLinkedListRemoveNode(KviCsLinkedListNodeT *NodeToRemove) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
