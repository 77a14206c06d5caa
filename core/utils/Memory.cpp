// Accounted heap memory: every block of the library's tables is taken and
// given back here, so the live-block count shows leaks and a test can make
// any allocation fail.
#include "core/utils/Memory.h"

#include <atomic>
#include <cstdint>
#include <cstdlib>

#include "core/utils/KviTrace.h"
#include "kvi/KviMemory.h"

// Only the numeric address of a released block is logged; gcc cannot tell
// that from a use of the block.
#if defined(__GNUC__) && !defined(__clang__)
#pragma GCC diagnostic ignored "-Wuse-after-free"
#endif

namespace
{
// Atomic because threads of the daemon and of plug-ins allocate at once.
std::atomic<SaHpiInt32T> segmentsAllocated{0};
std::atomic<SaHpiInt32T> failCountdown{0};

SaHpiUint32T addressOf(const void *p)
{
    return static_cast<SaHpiUint32T>(reinterpret_cast<uintptr_t>(p));
}

// True when the failure hook says this allocation is the one to fail.
bool injectedFailure()
{
    SaHpiInt32T n = failCountdown.load();
    while (n > 0) {
        if (failCountdown.compare_exchange_weak(n, n - 1))
            return n == 1;
    }
    return false;
}
} // namespace

void kviCsMemoryFailNthAllocation(SaHpiInt32T Nth) noexcept
{
    failCountdown.store(Nth > 0 ? Nth : 0);
}

extern "C" {

KVI_EXPORT void *kviCsMalloc(const char *File, const char *Function, SaHpiUint32T Line,
                             SaHpiInt32T Size) noexcept
{
    KVI_TRACE("");
    KVI_DLOG(KVI_LOG_DBG_H, "Request to malloc %d bytes", Size);
    if (File == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "File parameter is NULL");
        return nullptr;
    }
    if (Function == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Function parameter is NULL");
        return nullptr;
    }
    if (Size == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't malloc size 0");
        return nullptr;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "About to malloc");
    // A negative size is a caller's overflow; refuse it like a failed
    // allocation rather than ask for gigabytes.
    void *block = (Size < 0 || injectedFailure()) ? nullptr : malloc(static_cast<size_t>(Size));
    KVI_DLOG(KVI_LOG_DBG_L, "malloc returned %p", block);
    if (block == nullptr) {
        KVI_WLOG(KVI_LOG_WARN, "Malloc call failed");
        return nullptr;
    }
    SaHpiInt32T count = ++segmentsAllocated;
    KVI_DLOG(KVI_LOG_DBG_L, "Memory segments allocated: %d", count);
    KVI_DLOG(KVI_LOG_DBG_L, "Allocated memory %p", block);
    KVI_MLOG(KVI_LOG_MEM, "Malloc: %#8.8x %-4d %-4d %s %s %u", addressOf(block), count, Size, File,
             Function, Line);
    return block;
}

KVI_EXPORT SaErrorT kviCsFree(const char *File, const char *Function, SaHpiUint32T Line,
                              void *Ptr) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(File);
    KVI_NULL_CHECK(Function);
    if (Ptr == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Ptr is NULL. %s %s %u", File, Function, Line);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "About to free %p", Ptr);
    SaHpiUint32T address = addressOf(Ptr); // the block is gone after free
    free(Ptr);
    SaHpiInt32T count = --segmentsAllocated;
    KVI_MLOG(KVI_LOG_MEM, "Free: %#8.8x %d %s %s %u", address, count, File, Function, Line);
    return SA_OK;
}

KVI_EXPORT void *kviCsRealloc(const char *File, const char *Function, SaHpiUint32T Line, void *Ptr,
                              SaHpiInt32T Size) noexcept
{
    KVI_TRACE("");
    if (Ptr == nullptr && Size == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Changing size of NULL to 0?");
        return nullptr;
    }
    if (Size == 0) {
        KVI_DLOG(KVI_LOG_DBG_L, "called with Size of 0. Passing request on to kviCsFree.");
        kviCsFree(File, Function, Line, Ptr);
        return nullptr;
    }
    if (Ptr == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_L, "called with NULL for Ptr. Passing request on to kviCsMalloc.");
        return kviCsMalloc(File, Function, Line, Size);
    }
    if (File == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "File parameter is NULL");
        return nullptr;
    }
    if (Function == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Function parameter is NULL");
        return nullptr;
    }
    SaHpiUint32T oldAddress = addressOf(Ptr);
    void *block = (Size < 0 || injectedFailure()) ? nullptr : realloc(Ptr, static_cast<size_t>(Size));
    if (block == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Realloc call failed");
        return nullptr;
    }
    KVI_MLOG(KVI_LOG_MEM, "ReallocOld: %#8.8x ReallocNew: %#8.8x %d %u %s %s %u", oldAddress,
             addressOf(block), segmentsAllocated.load(), static_cast<SaHpiUint32T>(Size), File,
             Function, Line);
    return block;
}

KVI_EXPORT SaErrorT kviCsGetMemorySegmentsAllocated(SaHpiInt32T *Segments) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Segments);
    *Segments = segmentsAllocated.load();
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsMemoryInitialize(void) noexcept
{
    KVI_TRACE("");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsMemoryFinalize(void) noexcept
{
    KVI_TRACE("");
    return SA_OK;
}

} // extern "C"
