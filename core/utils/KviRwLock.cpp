// Writer-preference reader/writer lock made of five counting semaphores.
//
// Access is the resource: one writer, or the reader group as a whole (the
// first reader takes it, the last gives it back). ReadWrite is the readers'
// gate: the first waiting writer shuts it and the last leaving writer opens it
// again, so readers that come after a writer wait behind it. Read lets one
// would-be reader at a time queue at that gate. ReadMutex and WriteMutex guard
// the two counters. A blocking acquisition computes one deadline and every
// semaphore wait shares it, so the timeout bounds the whole acquisition.
#include <cstdint>
#include <cstdlib>
#include <initializer_list>

#include "core/utils/KviTrace.h"
#include "kvi/KviRwLock.h"

// Module-private steps, reachable by the unit tests through the static library.
void kviCsRwLockWriterUnlock(KviCsRwLockT *RwLock) noexcept;
void kviCsRwLockRdLockCleanup(int WhereFailed, KviCsRwLockT *RwLock) noexcept;
void kviCsRwLockDestroyCleanup(int WhereFailed, KviCsRwLockT *RwLock) noexcept;

namespace
{
// Waits inside an unlock: the semaphores are held only for a few counter
// updates, so a long wait means the lock state is corrupt.
constexpr SaHpiUint32T kUnlockWaitMs = 100;
// The short waits of TryRdLock, which must not block for long.
constexpr SaHpiUint32T kTryWaitMs = 10;

// What a failed read acquisition holds, named after where it failed; the
// values are those kviCsRwLockRdLockCleanup takes.
enum ReaderFailure : int {
    kFailedAtCounter = 1,   // holds Read, ReadWrite and ReadMutex
    kFailedAtRead = 2,      // holds nothing
    kFailedAtReadMutex = 3, // holds Read and ReadWrite
    kFailedAtReadWrite = 4, // holds Read
};

struct SemSlot {
    KviCsSemaphore KviCsRwLockT::*member;
    const char *name;
};
constexpr SemSlot kAccess{&KviCsRwLockT::Access, "Access"};
constexpr SemSlot kRead{&KviCsRwLockT::Read, "Read"};
constexpr SemSlot kReadMutex{&KviCsRwLockT::ReadMutex, "ReadMutex"};
constexpr SemSlot kReadWrite{&KviCsRwLockT::ReadWrite, "ReadWrite"};
constexpr SemSlot kWriteMutex{&KviCsRwLockT::WriteMutex, "WriteMutex"};
// Creation and destruction order; Destroy's WhereFailed is the 1-based
// position of the semaphore it could not take.
constexpr SemSlot kAllSems[] = {kAccess, kRead, kReadMutex, kReadWrite, kWriteMutex};
constexpr int kSemCount = sizeof(kAllSems) / sizeof(kAllSems[0]);

KviCsSemaphore *sem(KviCsRwLockT *RwLock, const SemSlot &slot) noexcept
{
    return &(RwLock->*slot.member);
}

// Giving a semaphore back must not fail: if it does, the lock is wedged for
// every thread, so the process ends rather than hang later.
void postOrDie(KviCsRwLockT *RwLock, std::initializer_list<SemSlot> slots) noexcept
{
    for (const SemSlot &slot : slots) {
        SaErrorT rc = KVI_CS_SEM_POST(sem(RwLock, slot));
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_FATAL, "kviCsSemPost on &RwLock->%s returned %d", slot.name, rc);
            exit(1);
        }
    }
}

// The public functions' caller and operation, for the lock trace. The trace
// names the code that used the lock, so a stuck lock leads to its holder.
struct RwCall {
    const char *file;
    const char *func;
    int line;
    KviCsRwLockT *lock;
    const char *word; // Init, Destroy, RdLock, ...

    void trace(const char *SrcFile, int SrcLine, const char *SrcFunc, SaHpiUint32T Level,
               const char *phase) const noexcept
    {
        if (!kviCsLogWanted(Level))
            return;
        kviCsLogger(SrcFile, static_cast<SaHpiInt16T>(SrcLine), SrcFunc, Level,
                    "%s %s() #%d %#X %s %s", file, func, line,
                    static_cast<unsigned>(reinterpret_cast<uintptr_t>(lock)), word, phase);
    }
};

// Entry of every public function: trace, refuse null arguments before any
// semaphore is touched, then the lock's start trace.
#define KVI_RW_LOCK_ENTER(Word)                                                                    \
    KVI_TRACE("");                                                                                 \
    KVI_NULL_CHECK(RwLock);                                                                        \
    KVI_NULL_CHECK(FileName);                                                                      \
    KVI_NULL_CHECK(FuncName);                                                                      \
    const RwCall call{FileName, FuncName, LineNum, RwLock, Word};                                  \
    call.trace(KVI_LOG_SEM, "Start")

bool deadlineFrom(SaHpiUint32T Timeout, struct timespec *Deadline) noexcept
{
    SaErrorT rc = kviCsConvertTimeoutToTimespec(Timeout, Deadline);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsConvertTimeoutToTimespec failed with %d", rc);
    return rc == SA_OK;
}

// The three gates a reader passes in order, and what it gives back when one
// of them cannot be passed.
struct ReaderGate {
    SemSlot slot;
    ReaderFailure failure;
};
constexpr ReaderGate kReaderGates[] = {
    {kRead, kFailedAtRead}, {kReadWrite, kFailedAtReadWrite}, {kReadMutex, kFailedAtReadMutex}};

SaErrorT readerGaveUp(KviCsRwLockT *RwLock, SaErrorT rc, const ReaderGate &gate) noexcept
{
    if (rc == SA_ERR_HPI_TIMEOUT) {
        KVI_SLOG(KVI_LOG_SEM, "Timeout %s", gate.slot.name);
        kviCsRwLockRdLockCleanup(gate.failure, RwLock);
        return SA_ERR_HPI_TIMEOUT;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't acquire lock on the %s Semaphore.", gate.slot.name);
    kviCsRwLockRdLockCleanup(gate.failure, RwLock);
    KVI_SLOG(KVI_LOG_SEM, "Error %s", gate.slot.name);
    return SA_ERR_HPI_ERROR;
}

// Counts the reader in; the first of a group takes Access for all of them.
// Called with the three gates held; on failure they are all given back.
SaErrorT joinReaders(KviCsRwLockT *RwLock, const struct timespec *Deadline) noexcept
{
    if (RwLock->NumReaders == KVI_MAX_UINT32) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Returning with error to prevent overflow of RwLock->NumReaders");
        kviCsRwLockRdLockCleanup(kFailedAtCounter, RwLock);
        KVI_SLOG(KVI_LOG_SEM, "NumReaders overflow conditions");
        return SA_ERR_HPI_ERROR;
    }
    if (++RwLock->NumReaders != 1)
        return SA_OK;
    SaErrorT rc = kviCsSemWaitTime(&RwLock->Access, Deadline);
    if (rc == SA_OK)
        return SA_OK;
    if (rc == SA_ERR_HPI_TIMEOUT) {
        KVI_SLOG(KVI_LOG_SEM, "Timeout Access");
        --RwLock->NumReaders;
        kviCsRwLockRdLockCleanup(kFailedAtCounter, RwLock);
        return SA_ERR_HPI_TIMEOUT;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't acquire lock on the Access Semaphore.");
    --RwLock->NumReaders;
    KVI_SLOG(KVI_LOG_SEM, "Error Access");
    kviCsRwLockRdLockCleanup(kFailedAtCounter, RwLock);
    return SA_ERR_HPI_ERROR;
}

// A writer's failed wait on WriteMutex or on the readers' gate. Both time-outs
// log the WriteMutex text; log readers have always matched on it.
SaErrorT writerWaitFailed(SaErrorT rc) noexcept
{
    if (rc == SA_ERR_HPI_TIMEOUT) {
        KVI_SLOG(KVI_LOG_SEM, "Timeout WriteMutex");
        return SA_ERR_HPI_TIMEOUT;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsSemWaitTime returned %d", rc);
    return SA_ERR_HPI_ERROR;
}

// Counts the writer in; the first one shuts the readers' gate. Called with
// WriteMutex held and gives it back in every case.
SaErrorT joinWriters(KviCsRwLockT *RwLock, const struct timespec *Deadline) noexcept
{
    if (RwLock->NumWriters == KVI_MAX_UINT32) {
        KVI_WLOG(KVI_LOG_WARN, "RwLock->NumWriters == KVI_MAX_UINT32");
        KVI_SLOG(KVI_LOG_SEM, "RwLock->NumWriters == KVI_MAX_UINT32");
        postOrDie(RwLock, {kWriteMutex});
        return SA_ERR_HPI_ERROR;
    }
    if (++RwLock->NumWriters == 1) {
        SaErrorT rc = kviCsSemWaitTime(&RwLock->ReadWrite, Deadline);
        if (rc != SA_OK) {
            rc = writerWaitFailed(rc);
            --RwLock->NumWriters;
            postOrDie(RwLock, {kWriteMutex});
            return rc;
        }
    }
    postOrDie(RwLock, {kWriteMutex});
    return SA_OK;
}

// The gates of a try-read, each tried without a real wait. Stops at the
// first refusal and says where it happened.
SaErrorT tryReaderGates(KviCsRwLockT *RwLock, ReaderFailure *Failure) noexcept
{
    SaErrorT rc = KVI_CS_SEM_WAIT(&RwLock->Read, kTryWaitMs);
    *Failure = kFailedAtRead;
    if (rc == SA_OK) {
        rc = KVI_CS_SEM_TRYWAIT(&RwLock->ReadWrite);
        *Failure = kFailedAtReadWrite;
    }
    if (rc == SA_OK) {
        rc = KVI_CS_SEM_WAIT(&RwLock->ReadMutex, kTryWaitMs);
        *Failure = kFailedAtReadMutex;
    }
    if (rc == SA_OK && RwLock->NumReaders == 0) {
        rc = KVI_CS_SEM_TRYWAIT(&RwLock->Access);
        *Failure = kFailedAtCounter;
    }
    return rc;
}
} // namespace

void kviCsRwLockRdLockCleanup(int WhereFailed, KviCsRwLockT *RwLock) noexcept
{
    KVI_TRACE("WhereFailed: %d", WhereFailed);
    if (RwLock == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Null RwLock passed in. Can't clean up, bailing");
        return;
    }
    switch (WhereFailed) {
    case kFailedAtCounter:
        postOrDie(RwLock, {kReadMutex, kReadWrite, kRead});
        break;
    case kFailedAtReadMutex:
        postOrDie(RwLock, {kReadWrite, kRead});
        break;
    case kFailedAtReadWrite:
        postOrDie(RwLock, {kRead});
        break;
    case kFailedAtRead:
        break;
    default:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value (%d) for WhereFailed", WhereFailed);
    }
}

void kviCsRwLockDestroyCleanup(int WhereFailed, KviCsRwLockT *RwLock) noexcept
{
    KVI_TRACE("WhereFailed: %d", WhereFailed);
    if (RwLock == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Null RwLock, can't cleanup");
        exit(1);
    }
    if (WhereFailed > kSemCount) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value (%d) passed in as WhereFailed", WhereFailed);
        return;
    }
    // Give back, last taken first, every semaphore taken before the failing one.
    for (int taken = WhereFailed - 1; taken >= 1; --taken)
        postOrDie(RwLock, {kAllSems[taken - 1]});
}

void kviCsRwLockWriterUnlock(KviCsRwLockT *RwLock) noexcept
{
    KVI_TRACE("");
    SaErrorT rc = KVI_CS_SEM_WAIT(&RwLock->WriteMutex, kUnlockWaitMs);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL,
                 "KVI_CS_SEM_WAIT returned %d while waiting on WriteMutex. Bailing.", rc);
        exit(1);
    }
    if (RwLock->NumWriters == 0) {
        KVI_ELOG(KVI_LOG_ERR_FATAL,
                 "RwLock->NumWriters == 0. Continuing would cause an underflow Bailing.");
        exit(1);
    }
    if (--RwLock->NumWriters == 0)
        postOrDie(RwLock, {kReadWrite});
    postOrDie(RwLock, {kWriteMutex});
}

SaErrorT kviCsRwLockInit(const char *FileName, const char *FuncName, int LineNum,
                         KviCsRwLockT *RwLock) noexcept
{
    KVI_RW_LOCK_ENTER("Init");
    for (const SemSlot &slot : kAllSems) {
        if (KVI_CS_SEM_INIT(sem(RwLock, slot), 1) != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't initialize %s semaphore!", slot.name);
            return SA_ERR_HPI_ERROR;
        }
    }
    RwLock->NumWriters = 0;
    RwLock->NumReaders = 0;
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockDestroy(const char *FileName, const char *FuncName, int LineNum,
                            KviCsRwLockT *RwLock) noexcept
{
    KVI_RW_LOCK_ENTER("Destroy");
    // Holding all five at once proves that nobody holds the lock or is
    // half-way through taking or releasing it.
    for (int i = 0; i < kSemCount; ++i) {
        if (KVI_CS_SEM_TRYWAIT(sem(RwLock, kAllSems[i])) != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't acquire lock on the %s Semaphore.",
                     kAllSems[i].name);
            kviCsRwLockDestroyCleanup(i + 1, RwLock);
            return SA_ERR_HPI_BUSY;
        }
    }
    for (const SemSlot &slot : kAllSems) {
        SaErrorT rc = KVI_CS_SEM_DESTROY(sem(RwLock, slot));
        if (rc != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to destroy %s, (rc=%d) continuing", slot.name,
                     rc);
    }
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockRdLock(const char *FileName, const char *FuncName, int LineNum,
                           KviCsRwLockT *RwLock, SaHpiUint32T Timeout) noexcept
{
    KVI_RW_LOCK_ENTER("RdLock");
    struct timespec deadline;
    if (!deadlineFrom(Timeout, &deadline))
        return SA_ERR_HPI_ERROR;
    for (const ReaderGate &gate : kReaderGates) {
        SaErrorT rc = kviCsSemWaitTime(sem(RwLock, gate.slot), &deadline);
        if (rc != SA_OK)
            return readerGaveUp(RwLock, rc, gate);
    }
    SaErrorT rc = joinReaders(RwLock, &deadline);
    if (rc != SA_OK)
        return rc;
    postOrDie(RwLock, {kReadMutex, kReadWrite, kRead});
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockRdUnlock(const char *FileName, const char *FuncName, int LineNum,
                             KviCsRwLockT *RwLock) noexcept
{
    KVI_RW_LOCK_ENTER("RdUnlock");
    SaErrorT rc = KVI_CS_SEM_WAIT(&RwLock->ReadMutex, kUnlockWaitMs);
    if (rc == SA_ERR_HPI_TIMEOUT) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Timeout acquiring ReadMutex for unlock");
        exit(1);
    }
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't acquire lock on the ReadMutex.");
        exit(1);
    }
    if (RwLock->NumReaders == 0) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Numreaders is %d, can't decrement! Bailing",
                 static_cast<int>(RwLock->NumReaders));
        exit(1);
    }
    const bool lastReader = --RwLock->NumReaders == 0;
    postOrDie(RwLock, {kReadMutex});
    // The group's Access goes back last: it can let in the writer that
    // unloads a plug-in and destroys this lock, so nothing of the lock may be
    // touched after it. A reader arriving in between waits on Access.
    if (lastReader)
        postOrDie(RwLock, {kAccess});
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockWrLock(const char *FileName, const char *FuncName, int LineNum,
                           KviCsRwLockT *RwLock, SaHpiUint32T Timeout) noexcept
{
    KVI_RW_LOCK_ENTER("WrLock");
    struct timespec deadline;
    if (!deadlineFrom(Timeout, &deadline))
        return SA_ERR_HPI_ERROR;
    SaErrorT rc = kviCsSemWaitTime(&RwLock->WriteMutex, &deadline);
    if (rc != SA_OK)
        return writerWaitFailed(rc);
    rc = joinWriters(RwLock, &deadline);
    if (rc != SA_OK)
        return rc;
    // The gate is shut; wait for the readers inside (or the writer ahead) to leave.
    rc = kviCsSemWaitTime(&RwLock->Access, &deadline);
    if (rc != SA_OK) {
        KVI_SLOG(KVI_LOG_SEM, "Timeout Access");
        kviCsRwLockWriterUnlock(RwLock);
        return rc == SA_ERR_HPI_TIMEOUT ? SA_ERR_HPI_TIMEOUT : SA_ERR_HPI_ERROR;
    }
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockWrUnlock(const char *FileName, const char *FuncName, int LineNum,
                             KviCsRwLockT *RwLock) noexcept
{
    KVI_RW_LOCK_ENTER("WrUnlock");
    postOrDie(RwLock, {kAccess});
    kviCsRwLockWriterUnlock(RwLock);
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockTryRdLock(const char *FileName, const char *FuncName, int LineNum,
                              KviCsRwLockT *RwLock) noexcept
{
    KVI_RW_LOCK_ENTER("TryRdLock");
    ReaderFailure failure;
    SaErrorT rc = tryReaderGates(RwLock, &failure);
    if (rc != SA_OK) {
        kviCsRwLockRdLockCleanup(failure, RwLock);
        // Only the two short waits can time out; a refused try-wait reports
        // busy, which becomes an error here. Callers tell "a writer is in or
        // waiting" (error) from "readers are busy" (busy) by this.
        return rc == SA_ERR_HPI_TIMEOUT ? SA_ERR_HPI_BUSY : SA_ERR_HPI_ERROR;
    }
    // Deliberately lower than RdLock's bound (the unsigned maximum); callers
    // are used to try-reads failing at the signed one.
    if (RwLock->NumReaders == static_cast<SaHpiUint32T>(KVI_MAX_INT32)) {
        postOrDie(RwLock, {kReadMutex, kReadWrite, kRead});
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't increment Readers, overflow");
        return SA_ERR_HPI_ERROR;
    }
    ++RwLock->NumReaders;
    postOrDie(RwLock, {kReadMutex, kReadWrite, kRead});
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}

SaErrorT kviCsRwLockTryWrLock(const char *FileName, const char *FuncName, int LineNum,
                              KviCsRwLockT *RwLock) noexcept
{
    KVI_RW_LOCK_ENTER("TryWrLock");
    // Unlike WrLock, Access is tried before the readers' gate: while readers
    // are inside, a refused try never touches the gate and so never delays
    // the readers that are arriving.
    if (KVI_CS_SEM_TRYWAIT(&RwLock->WriteMutex) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_L, "Couldn't acquire WriteMutex");
        return SA_ERR_HPI_BUSY;
    }
    if (KVI_CS_SEM_TRYWAIT(&RwLock->Access) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_L, "Couldn't acquire Access");
        postOrDie(RwLock, {kWriteMutex});
        return SA_ERR_HPI_BUSY;
    }
    if (++RwLock->NumWriters == 1 && KVI_CS_SEM_TRYWAIT(&RwLock->ReadWrite) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_L, "Couldn't acquire ReadWrite");
        --RwLock->NumWriters;
        postOrDie(RwLock, {kWriteMutex, kAccess});
        return SA_ERR_HPI_BUSY;
    }
    postOrDie(RwLock, {kWriteMutex});
    call.trace(KVI_LOG_SEM, "Done");
    return SA_OK;
}
