// Single-threaded behaviour of the reader/writer lock: results, what a refused
// acquisition gives back, bounds, traces and the fatal exits. The lock has no
// owner, so one thread can play every reader and writer.
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <functional>
#include <string>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

// Internal steps of the lock, reached through the static library.
void kviCsRwLockRdLockCleanup(int WhereFailed, KviCsRwLockT *RwLock) noexcept;
void kviCsRwLockDestroyCleanup(int WhereFailed, KviCsRwLockT *RwLock) noexcept;

namespace
{
using Sem = KviCsSemaphore KviCsRwLockT::*;
const std::string kAtRest = "W0 R0 WriteMutex1 ReadMutex1 Access1 Read1 ReadWrite1";

class KviRwLockTest : public testing::Test
{
  protected:
    void SetUp() override { ASSERT_EQ(KVI_CS_RW_LOCK_INIT(&lock), SA_OK); }
    void TearDown() override { EXPECT_EQ(KVI_CS_RW_LOCK_DESTROY(&lock), SA_OK); }

    // Counters and semaphore values in one string, so a failure shows them all.
    std::string state() const
    {
        return "W" + std::to_string(lock.NumWriters) + " R" + std::to_string(lock.NumReaders) +
               " WriteMutex" + std::to_string(lock.WriteMutex.Value) + " ReadMutex" +
               std::to_string(lock.ReadMutex.Value) + " Access" +
               std::to_string(lock.Access.Value) + " Read" + std::to_string(lock.Read.Value) +
               " ReadWrite" + std::to_string(lock.ReadWrite.Value);
    }
    void take(Sem s) { ASSERT_EQ(KVI_CS_SEM_WAIT(&(lock.*s), 0), SA_OK); }
    void give(Sem s) { ASSERT_EQ(KVI_CS_SEM_POST(&(lock.*s)), SA_OK); }

    KviCsRwLockT lock{};
};

double msSince(std::chrono::steady_clock::time_point start)
{
    return std::chrono::duration<double, std::milli>(std::chrono::steady_clock::now() - start)
        .count();
}

TEST_F(KviRwLockTest, HoldersLeaveTheLockAtRest)
{
    EXPECT_EQ(state(), kAtRest);
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_TRY_RD_LOCK(&lock), SA_OK);
    EXPECT_EQ(state(), "W0 R2 WriteMutex1 ReadMutex1 Access0 Read1 ReadWrite1");
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    EXPECT_EQ(state(), kAtRest);
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(state(), "W1 R0 WriteMutex1 ReadMutex1 Access0 Read1 ReadWrite0");
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_TRY_WR_LOCK(&lock), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
    EXPECT_EQ(state(), kAtRest);
}

TEST_F(KviRwLockTest, TimeoutZeroFailsAtOnceOnAHeldLock)
{
    auto start = std::chrono::steady_clock::now();
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_ERR_HPI_TIMEOUT);
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_ERR_HPI_TIMEOUT);
    // A second writer counts itself in, times out on Access and counts itself out.
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_ERR_HPI_TIMEOUT);
    EXPECT_EQ(state(), "W1 R0 WriteMutex1 ReadMutex1 Access0 Read1 ReadWrite0");
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
    EXPECT_LT(msSince(start), 500);
    EXPECT_EQ(state(), kAtRest);
}

TEST_F(KviRwLockTest, TryOperationsTellAWriterFromReaders)
{
    ASSERT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_OK);
    // Refused at the readers' gate by a try-wait: an error, not busy.
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_RD_LOCK(&lock), SA_ERR_HPI_ERROR);
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_WR_LOCK(&lock), SA_ERR_HPI_BUSY);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_WR_LOCK(&lock), SA_ERR_HPI_BUSY);
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    EXPECT_EQ(state(), kAtRest);
}

TEST_F(KviRwLockTest, RefusedAcquisitionGivesBackWhatItTook)
{
    auto rdLock = [](KviCsRwLockT *l) { return KVI_CS_RW_LOCK_RD_LOCK(l, 0); };
    auto wrLock = [](KviCsRwLockT *l) { return KVI_CS_RW_LOCK_WR_LOCK(l, 0); };
    auto tryRd = [](KviCsRwLockT *l) { return KVI_CS_RW_LOCK_TRY_RD_LOCK(l); };
    auto tryWr = [](KviCsRwLockT *l) { return KVI_CS_RW_LOCK_TRY_WR_LOCK(l); };
    auto destroy = [](KviCsRwLockT *l) { return KVI_CS_RW_LOCK_DESTROY(l); };
    struct Case {
        const char *name;
        std::function<SaErrorT(KviCsRwLockT *)> op;
        Sem held;
        SaErrorT expected;
    } cases[] = {
        {"RdLock/Read", rdLock, &KviCsRwLockT::Read, SA_ERR_HPI_TIMEOUT},
        {"RdLock/ReadWrite", rdLock, &KviCsRwLockT::ReadWrite, SA_ERR_HPI_TIMEOUT},
        {"RdLock/ReadMutex", rdLock, &KviCsRwLockT::ReadMutex, SA_ERR_HPI_TIMEOUT},
        {"RdLock/Access", rdLock, &KviCsRwLockT::Access, SA_ERR_HPI_TIMEOUT},
        {"TryRdLock/Read", tryRd, &KviCsRwLockT::Read, SA_ERR_HPI_BUSY},
        {"TryRdLock/ReadWrite", tryRd, &KviCsRwLockT::ReadWrite, SA_ERR_HPI_ERROR},
        {"TryRdLock/ReadMutex", tryRd, &KviCsRwLockT::ReadMutex, SA_ERR_HPI_BUSY},
        {"TryRdLock/Access", tryRd, &KviCsRwLockT::Access, SA_ERR_HPI_ERROR},
        {"WrLock/WriteMutex", wrLock, &KviCsRwLockT::WriteMutex, SA_ERR_HPI_TIMEOUT},
        {"WrLock/ReadWrite", wrLock, &KviCsRwLockT::ReadWrite, SA_ERR_HPI_TIMEOUT},
        {"WrLock/Access", wrLock, &KviCsRwLockT::Access, SA_ERR_HPI_TIMEOUT},
        {"TryWrLock/WriteMutex", tryWr, &KviCsRwLockT::WriteMutex, SA_ERR_HPI_BUSY},
        {"TryWrLock/Access", tryWr, &KviCsRwLockT::Access, SA_ERR_HPI_BUSY},
        {"TryWrLock/ReadWrite", tryWr, &KviCsRwLockT::ReadWrite, SA_ERR_HPI_BUSY},
        {"Destroy/Access", destroy, &KviCsRwLockT::Access, SA_ERR_HPI_BUSY},
        {"Destroy/Read", destroy, &KviCsRwLockT::Read, SA_ERR_HPI_BUSY},
        {"Destroy/ReadMutex", destroy, &KviCsRwLockT::ReadMutex, SA_ERR_HPI_BUSY},
        {"Destroy/ReadWrite", destroy, &KviCsRwLockT::ReadWrite, SA_ERR_HPI_BUSY},
        {"Destroy/WriteMutex", destroy, &KviCsRwLockT::WriteMutex, SA_ERR_HPI_BUSY},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.name);
        take(c.held);
        EXPECT_EQ(c.op(&lock), c.expected);
        give(c.held);
        EXPECT_EQ(state(), kAtRest);
    }
}

TEST_F(KviRwLockTest, DestroyWhileReadIsBusyAndTheLockStaysUsable)
{
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_DESTROY(&lock), SA_ERR_HPI_BUSY);
    EXPECT_TRUE(log.contains("Can't acquire lock on the Access Semaphore."));
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_UNLOCK(&lock), SA_OK);
}

TEST_F(KviRwLockTest, CounterBoundsRefuseWithoutChangingTheLock)
{
    KviLogCapture log(KVI_LOG_WARN_NUM);
    lock.NumReaders = KVI_MAX_UINT32;
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Returning with error to prevent overflow of RwLock->NumReaders"));
    // The try form stops at the signed maximum, where the blocking form still admits.
    lock.NumReaders = KVI_MAX_INT32;
    EXPECT_EQ(KVI_CS_RW_LOCK_TRY_RD_LOCK(&lock), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Can't increment Readers, overflow"));
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    EXPECT_EQ(lock.NumReaders, 0x80000000u);
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
    lock.NumReaders = 0;
    lock.NumWriters = KVI_MAX_UINT32;
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_ERR_HPI_ERROR);
    EXPECT_EQ(log.matching("RwLock->NumWriters == KVI_MAX_UINT32").size(), 1u); // Sem line filtered
    lock.NumWriters = 0;
    EXPECT_EQ(state(), kAtRest);
}

TEST_F(KviRwLockTest, NullArgumentsAreRefusedFirst)
{
    using Op = std::function<SaErrorT(const char *, const char *, KviCsRwLockT *)>;
    const Op ops[] = {
        [](auto f, auto fn, auto l) { return kviCsRwLockInit(f, fn, 1, l); },
        [](auto f, auto fn, auto l) { return kviCsRwLockDestroy(f, fn, 1, l); },
        [](auto f, auto fn, auto l) { return kviCsRwLockRdLock(f, fn, 1, l, 0); },
        [](auto f, auto fn, auto l) { return kviCsRwLockWrLock(f, fn, 1, l, 0); },
        [](auto f, auto fn, auto l) { return kviCsRwLockTryRdLock(f, fn, 1, l); },
        [](auto f, auto fn, auto l) { return kviCsRwLockTryWrLock(f, fn, 1, l); },
        [](auto f, auto fn, auto l) { return kviCsRwLockRdUnlock(f, fn, 1, l); },
        [](auto f, auto fn, auto l) { return kviCsRwLockWrUnlock(f, fn, 1, l); },
    };
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    for (const Op &op : ops) {
        EXPECT_EQ(op("f.c", "f", nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(op(nullptr, "f", &lock), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(op("f.c", nullptr, &lock), SA_ERR_HPI_INVALID_PARAMS);
    }
    EXPECT_EQ(log.matching("RwLock pointer is NULL.").size(), 8u);
    EXPECT_EQ(log.matching("FileName pointer is NULL.").size(), 8u);
    EXPECT_EQ(log.matching("FuncName pointer is NULL.").size(), 8u);
    EXPECT_EQ(state(), kAtRest);
}

TEST_F(KviRwLockTest, TraceNamesTheCallerAndTheLock)
{
    KviLogCapture log(KVI_LOG_ERR_FATAL_NUM | KVI_LOG_SEM_NUM);
    int line = __LINE__ + 1;
    ASSERT_EQ(KVI_CS_RW_LOCK_RD_LOCK(&lock, 0), SA_OK);
    char expected[512];
    snprintf(expected, sizeof expected, "%s TestBody() #%d %#X RdLock", __FILE__, line,
             static_cast<unsigned>(reinterpret_cast<uintptr_t>(&lock)));
    EXPECT_EQ(log.matching(std::string(expected) + " Start").size(), 1u);
    EXPECT_EQ(log.matching(std::string(expected) + " Done").size(), 1u);
    log.clear();
    EXPECT_EQ(KVI_CS_RW_LOCK_WR_LOCK(&lock, 0), SA_ERR_HPI_TIMEOUT);
    EXPECT_TRUE(log.contains("Timeout Access"));
    EXPECT_FALSE(log.contains("WrLock Done"));
    EXPECT_EQ(KVI_CS_RW_LOCK_RD_UNLOCK(&lock), SA_OK);
}

TEST_F(KviRwLockTest, CleanupRefusesValuesItDoesNotKnow)
{
    KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
    kviCsRwLockRdLockCleanup(7, &lock);
    EXPECT_TRUE(log.contains("Invalid value (7) for WhereFailed"));
    kviCsRwLockDestroyCleanup(6, &lock);
    EXPECT_TRUE(log.contains("Invalid value (6) passed in as WhereFailed"));
    kviCsRwLockRdLockCleanup(1, nullptr); // logged, not fatal
    EXPECT_TRUE(log.contains("Null RwLock passed in. Can't clean up, bailing"));
    EXPECT_EQ(state(), kAtRest);
}

TEST_F(KviRwLockTest, InconsistentReleasesEndTheProcess)
{
    struct Case {
        const char *fatalLine;
        std::function<void(KviCsRwLockT *)> run;
    } cases[] = {
        {"Numreaders is 0, can't decrement! Bailing",
         [](KviCsRwLockT *l) { KVI_CS_RW_LOCK_RD_UNLOCK(l); }},
        {"RwLock->NumWriters == 0. Continuing would cause an underflow Bailing.",
         [](KviCsRwLockT *l) { KVI_CS_RW_LOCK_WR_UNLOCK(l); }},
        {"Timeout acquiring ReadMutex for unlock",
         [](KviCsRwLockT *l) {
             KVI_CS_RW_LOCK_RD_LOCK(l, 0);
             KVI_CS_SEM_WAIT(&l->ReadMutex, 0);
             KVI_CS_RW_LOCK_RD_UNLOCK(l);
         }},
        {"KVI_CS_SEM_WAIT returned -1006 while waiting on WriteMutex. Bailing.",
         [](KviCsRwLockT *l) {
             KVI_CS_RW_LOCK_WR_LOCK(l, 0);
             KVI_CS_SEM_WAIT(&l->WriteMutex, 0);
             KVI_CS_RW_LOCK_WR_UNLOCK(l);
         }},
        {"kviCsSemPost on &RwLock->Access returned -1001",
         [](KviCsRwLockT *l) {
             KVI_CS_RW_LOCK_RD_LOCK(l, 0);
             l->Access.Value = KVI_MAX_INT32; // a post can no longer succeed
             KVI_CS_RW_LOCK_RD_UNLOCK(l);
         }},
        {"Null RwLock, can't cleanup",
         [](KviCsRwLockT *) { kviCsRwLockDestroyCleanup(2, nullptr); }},
        {"kviCsRwLockWrUnlock on noLock returned -1011",
         [](KviCsRwLockT *) {
             KviCsRwLockT *noLock = nullptr;
             KVI_CS_DOA_RW_LOCK_WR_UNLOCK(noLock);
         }},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.fatalLine);
        KviLogCapture log(KVI_LOG_ERR_NONFATAL_NUM);
        EXPECT_EXIT(c.run(&lock), testing::ExitedWithCode(1), "");
        EXPECT_EQ(log.matching(c.fatalLine).size(), 1u);
    }
}
} // namespace
