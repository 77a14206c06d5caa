#include "core/SaHpi/session/Session.h"

#include <array>
#include <atomic>
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

using Table = std::array<KviSessionIdsT, KVI_CS_MAX_SESSIONS>;

// What the hook saw: how often it ran, and whether the session that was just
// closed could already be looked up (it can only if the table's semaphore
// was free at that moment).
std::atomic<int> signalCalls{0};
std::atomic<SaErrorT> signalResult{SA_OK};
std::atomic<SaHpiSessionIdT> watchedSession{0};
std::atomic<SaErrorT> validateInsideSignal{SA_OK};

SaErrorT recordingSignal()
{
    signalCalls++;
    validateInsideSignal = kviCsSessionValidate(watchedSession);
    return signalResult;
}

Table tableNow()
{
    Table t{};
    EXPECT_EQ(kviCsSessionTableCopy(t.data()), SA_OK);
    return t;
}

void expectSameTable(const Table &before, const Table &after)
{
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++) {
        SCOPED_TRACE("slot " + std::to_string(i));
        EXPECT_EQ(after[i].InUse, before[i].InUse);
        EXPECT_EQ(after[i].DomainId, before[i].DomainId);
        EXPECT_EQ(after[i].ConnDesc, before[i].ConnDesc);
        EXPECT_EQ(after[i].EventSubscribed, before[i].EventSubscribed);
        EXPECT_EQ(after[i].LastEventRead, before[i].LastEventRead);
        EXPECT_EQ(after[i].SessionId, before[i].SessionId);
    }
}

// A line with the text written at the level, as the logger labels it, and
// by the function when one is named.
bool loggedAt(const KviLogCapture &log, SaHpiUint32T level, std::string_view text,
              const std::string &function = "")
{
    const char *label = level >= KVI_LOG_ERR_NONFATAL_NUM ? KVI_LOG_ERROR_STRING
                        : level == KVI_LOG_WARN_NUM       ? KVI_LOG_WARNING_STRING
                                                          : KVI_LOG_DEBUG_STRING;
    char tag[32];
    snprintf(tag, sizeof tag, "%s %3.3u", label, level);
    for (const std::string &line : log.matching(text))
        if (line.find(tag) != std::string::npos &&
            (function.empty() || line.find(" " + function + "()") != std::string::npos))
            return true;
    return false;
}

class SessionTest : public testing::Test
{
  protected:
    void SetUp() override
    {
        ASSERT_EQ(kviCsSessionInitialize(), SA_OK);
        previousHook_ = kviCsSessionSetSignalHook(recordingSignal);
        signalCalls = 0;
        signalResult = SA_OK;
        watchedSession = 0;
        validateInsideSignal = SA_OK;
        log.clear();
    }
    void TearDown() override { kviCsSessionSetSignalHook(previousHook_); }

    static SaHpiSessionIdT open()
    {
        SaHpiSessionIdT id = 0;
        EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id), SA_OK);
        return id;
    }
    static void subscribe(SaHpiSessionIdT id, SaHpiUint32T lastEvent = 0)
    {
        EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, lastEvent), SA_OK);
    }

    KviLogCapture log{KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM};

  private:
    KviCsSessionSignalFnT previousHook_ = nullptr;
};

// Holds the table's semaphore, so every operation that needs it times out.
class HeldTable
{
  public:
    HeldTable() { EXPECT_EQ(KVI_CS_SEM_WAIT(kviCsSessionSemaphore(), 0), SA_OK); }
    ~HeldTable() { EXPECT_EQ(KVI_CS_SEM_POST(kviCsSessionSemaphore()), SA_OK); }
};

TEST_F(SessionTest, IdsIncreaseAndAreNeverReused)
{
    const SaHpiSessionIdT first = open();
    EXPECT_GE(first, static_cast<SaHpiSessionIdT>(KVI_CS_SESSION_OFFSET));
    ASSERT_EQ(kviCsSessionClose(first), SA_OK);
    // The freed slot is taken again, but with a fresh id.
    const SaHpiSessionIdT second = open();
    EXPECT_EQ(second, first + 1);
    EXPECT_EQ(tableNow()[0].SessionId, second);
    EXPECT_TRUE(log.contains("Function exit: Session(" + std::to_string(second) + ")"));
}

TEST_F(SessionTest, NewSessionTakesLowestFreeSlot)
{
    std::vector<SaHpiSessionIdT> ids;
    for (int i = 0; i < 5; i++)
        ids.push_back(open());
    ASSERT_EQ(kviCsSessionClose(ids[1]), SA_OK);
    const SaHpiSessionIdT next = open();
    EXPECT_EQ(next, ids[4] + 1);
    const Table t = tableNow();
    EXPECT_EQ(t[1].SessionId, next);
    EXPECT_EQ(t[1].InUse, SAHPI_TRUE);
    EXPECT_EQ(t[5].InUse, SAHPI_FALSE);
}

TEST_F(SessionTest, FullTableRefusesWithoutSpendingAnId)
{
    std::vector<SaHpiSessionIdT> ids;
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++)
        ids.push_back(open());
    const Table before = tableNow();

    SaHpiSessionIdT extra = 0;
    EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &extra), SA_ERR_HPI_DATA_EX_LIMITS);
    EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &extra), SA_ERR_HPI_DATA_EX_LIMITS);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "Out of space-- can't open another session."));
    expectSameTable(before, tableNow());

    ASSERT_EQ(kviCsSessionClose(ids[40]), SA_OK);
    EXPECT_EQ(open(), ids.back() + 1);
    EXPECT_EQ(tableNow()[40].SessionId, ids.back() + 1);
}

TEST_F(SessionTest, OnlyTheDefaultDomainOpens)
{
    const Table before = tableNow();
    SaHpiSessionIdT id = 77;
    EXPECT_EQ(kviCsSessionOpen(1, &id), SA_ERR_HPI_INVALID_DOMAIN);
    EXPECT_EQ(id, 77u);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Invalid domain: 1"));
    expectSameTable(before, tableNow());

    SaHpiDomainIdT domain = 5;
    const SaHpiSessionIdT opened = open();
    EXPECT_EQ(kviCsGetDomainFromSession(opened, &domain), SA_OK);
    EXPECT_EQ(domain, static_cast<SaHpiDomainIdT>(SAHPI_DEFAULT_DOMAIN_ID));
}

TEST_F(SessionTest, LastIdBeforeTheEndOfTheIdSpaceIsFatal)
{
    // Only the child moves the counter, so the ids of later tests stay fresh.
    EXPECT_EXIT(
        {
            kviCsSessionSetNextId(0xFFFFFFFEu);
            SaHpiSessionIdT id = 0;
            if (kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id) != SA_OK || id != 0xFFFFFFFEu)
                exit(2);
            kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id);
            exit(3);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM, "Session Limit Reached, fatal error"));
}

TEST(SessionStartTest, FirstIdOfAProcessIs1000)
{
    // A re-executed child starts with the library's initial state.
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            SaHpiSessionIdT a = 0;
            SaHpiSessionIdT b = 0;
            kviCsSessionInitialize();
            kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &a);
            kviCsSessionClose(a);
            kviCsSessionInitialize(); // does not restart the ids
            kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &b);
            exit(a == 1000 && b == 1001 ? 1 : 2);
        },
        testing::ExitedWithCode(1), "");
}

TEST_F(SessionTest, ValidateAcceptsOnlyOpenSessions)
{
    const SaHpiSessionIdT id = open();
    EXPECT_EQ(kviCsSessionValidate(id), SA_OK);
    EXPECT_TRUE(log.contains("Function exit: Valid session"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM, "Session 1000: 1, Domain 0, ConnDesc 0"));
    ASSERT_EQ(kviCsSessionClose(id), SA_OK);
    EXPECT_EQ(kviCsSessionValidate(id), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_TRUE(log.contains("Function exit: Invalid session"));
    EXPECT_EQ(kviCsSessionValidate(id + 1000), SA_ERR_HPI_INVALID_SESSION);
    // Close-all leaves the id in the slot; it must still not validate.
    const SaHpiSessionIdT other = open();
    ASSERT_EQ(kviCsCloseAllSessions(), SA_OK);
    EXPECT_EQ(tableNow()[0].SessionId, other);
    EXPECT_EQ(kviCsSessionValidate(other), SA_ERR_HPI_INVALID_SESSION);
}

TEST_F(SessionTest, IdsBelowTheOffsetAreRefusedWithoutTheSemaphore)
{
    HeldTable held;
    const auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(kviCsSessionValidate(999), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSessionValidate(0), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSessionClose(999), SA_ERR_HPI_INVALID_SESSION);
    // The semaphore waits 500 ms; these answers must not have waited.
    EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(250));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Invalid session 999 passed in. "));
    EXPECT_TRUE(log.contains("Invalid session 0 passed in. "));
}

TEST_F(SessionTest, ClosingTwiceIsADuplicate)
{
    const SaHpiSessionIdT id = open();
    EXPECT_EQ(kviCsSessionClose(id), SA_OK);
    const Table before = tableNow();
    EXPECT_EQ(kviCsSessionClose(id), SA_ERR_HPI_DUPLICATE);
    EXPECT_EQ(kviCsSessionClose(id + 5000), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Can't close a closed session!"));
    expectSameTable(before, tableNow());
}

TEST_F(SessionTest, CloseClearsTheSlotButKeepsEventState)
{
    const SaHpiSessionIdT id = open();
    ASSERT_EQ(kviCsAddConnectionToSession(id, 12), SA_OK);
    subscribe(id, 42);
    ASSERT_EQ(kviCsSessionClose(id), SA_OK);
    KviSessionIdsT slot = tableNow()[0];
    EXPECT_EQ(slot.InUse, SAHPI_FALSE);
    EXPECT_EQ(slot.ConnDesc, 0);
    EXPECT_EQ(slot.SessionId, 0u);
    EXPECT_EQ(slot.EventSubscribed, SAHPI_TRUE);
    EXPECT_EQ(slot.LastEventRead, 42u);

    // The next open of the slot drops the subscription but not the position.
    const SaHpiSessionIdT next = open();
    slot = tableNow()[0];
    EXPECT_EQ(slot.EventSubscribed, SAHPI_FALSE);
    EXPECT_EQ(slot.LastEventRead, 42u);
    SaHpiBoolT subscribed = SAHPI_TRUE;
    EXPECT_EQ(kviCsGetSessionEventSubscription(next, &subscribed), SA_OK);
    EXPECT_EQ(subscribed, SAHPI_FALSE);
}

TEST_F(SessionTest, ClosingASubscribedSessionWakesReadersAfterReleasingTheTable)
{
    const SaHpiSessionIdT quiet = open();
    ASSERT_EQ(kviCsSessionClose(quiet), SA_OK);
    EXPECT_EQ(signalCalls, 0);

    const SaHpiSessionIdT id = open();
    subscribe(id);
    watchedSession = id;
    ASSERT_EQ(kviCsSessionClose(id), SA_OK);
    EXPECT_EQ(signalCalls, 1);
    // The woken reader can look the session up at once and finds it gone.
    EXPECT_EQ(validateInsideSignal, SA_ERR_HPI_INVALID_SESSION);
}

TEST_F(SessionTest, FailedSignalLeavesTheSessionClosed)
{
    const SaHpiSessionIdT id = open();
    subscribe(id);
    signalResult = SA_ERR_HPI_TIMEOUT;
    EXPECT_EQ(kviCsSessionClose(id), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "kviCsSignalEventThreads failed.  rc=-1006"));
    EXPECT_EQ(kviCsSessionValidate(id), SA_ERR_HPI_INVALID_SESSION);
}

TEST_F(SessionTest, ConnectionIsRecordedAndReplaced)
{
    const SaHpiSessionIdT id = open();
    SaHpiInt32T conn = -1;
    EXPECT_EQ(kviCsGetConnectionFromSession(id, &conn), SA_OK);
    EXPECT_EQ(conn, 0);
    EXPECT_EQ(kviCsAddConnectionToSession(id, 7), SA_OK);
    EXPECT_EQ(kviCsAddConnectionToSession(id, 9), SA_OK);
    EXPECT_EQ(kviCsGetConnectionFromSession(id, &conn), SA_OK);
    EXPECT_EQ(conn, 9);
}

TEST_F(SessionTest, CloseAllToConnectionClosesOnlyThatConnection)
{
    const SaHpiSessionIdT a = open(), b = open(), c = open();
    ASSERT_EQ(kviCsAddConnectionToSession(a, 7), SA_OK);
    ASSERT_EQ(kviCsAddConnectionToSession(b, 8), SA_OK);
    ASSERT_EQ(kviCsAddConnectionToSession(c, 7), SA_OK);

    EXPECT_EQ(kviCsCloseAllSessionsToConnection(7), SA_OK);
    EXPECT_EQ(signalCalls, 0); // nobody was subscribed
    EXPECT_EQ(kviCsSessionValidate(a), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSessionValidate(b), SA_OK);
    EXPECT_EQ(kviCsSessionValidate(c), SA_ERR_HPI_INVALID_SESSION);
    const Table t = tableNow();
    EXPECT_EQ(t[0].SessionId, a); // the id stays, without InUse it is dead
    EXPECT_EQ(t[0].ConnDesc, 0);
    EXPECT_EQ(t[2].ConnDesc, 0);

    subscribe(b);
    EXPECT_EQ(kviCsCloseAllSessionsToConnection(8), SA_OK);
    EXPECT_EQ(signalCalls, 1);
}

TEST_F(SessionTest, CloseAllToConnectionReportsAFailedSignal)
{
    const SaHpiSessionIdT a = open(), b = open();
    ASSERT_EQ(kviCsAddConnectionToSession(a, 3), SA_OK);
    ASSERT_EQ(kviCsAddConnectionToSession(b, 3), SA_OK);
    subscribe(a);
    subscribe(b);
    signalResult = SA_ERR_HPI_ERROR;
    EXPECT_EQ(kviCsCloseAllSessionsToConnection(3), SA_ERR_HPI_ERROR);
    EXPECT_EQ(signalCalls, 1); // one wake-up for the whole connection
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "kviCsSemWait failed.  rc=-1001"));
    EXPECT_EQ(kviCsSessionValidate(a), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSessionValidate(b), SA_ERR_HPI_INVALID_SESSION);
}

TEST_F(SessionTest, CloseAllClearsOnlyInUse)
{
    const SaHpiSessionIdT a = open(), b = open();
    ASSERT_EQ(kviCsAddConnectionToSession(a, 4), SA_OK);
    subscribe(b, 9);
    ASSERT_EQ(kviCsCloseAllSessions(), SA_OK);
    EXPECT_EQ(signalCalls, 1);
    const Table t = tableNow();
    EXPECT_EQ(t[0].InUse, SAHPI_FALSE);
    EXPECT_EQ(t[0].SessionId, a);
    EXPECT_EQ(t[0].ConnDesc, 4);
    EXPECT_EQ(t[1].InUse, SAHPI_FALSE);
    EXPECT_EQ(t[1].SessionId, b);
    EXPECT_EQ(t[1].EventSubscribed, SAHPI_TRUE);

    // A new session in slot 0 inherits the connection left there.
    const SaHpiSessionIdT next = open();
    SaHpiInt32T conn = 0;
    EXPECT_EQ(kviCsGetConnectionFromSession(next, &conn), SA_OK);
    EXPECT_EQ(conn, 4);

    signalResult = SA_ERR_HPI_BUSY;
    subscribe(next);
    EXPECT_EQ(kviCsCloseAllSessions(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "kviCsSemWait failed.  rc=-1003"));
    EXPECT_EQ(kviCsCloseAllSessions(), SA_OK); // nothing open: no signal
    EXPECT_EQ(signalCalls, 2);
}

TEST_F(SessionTest, SubscriptionStateChanges)
{
    const SaHpiSessionIdT id = open();
    SaHpiUint32T last = 0;
    EXPECT_EQ(kviCsSetSessionLastEvent(id, 5), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_H_NUM, "Can't set the TimeStamp without a subscription!"));
    EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_H_NUM, "Can't get the TimeStamp without a subscription!"));
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_FALSE, 0), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("This Session is not currently subscribed for events!"));

    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 17), SA_OK);
    EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_OK);
    EXPECT_EQ(last, 17u);
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 30), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_H_NUM, "This Session has already subscribed for events!"));
    EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_OK);
    EXPECT_EQ(last, 17u); // the refused call changed nothing

    EXPECT_EQ(kviCsSetSessionLastEvent(id, 0xFFFFFFFFu), SA_OK);
    EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_OK);
    EXPECT_EQ(last, 0xFFFFFFFFu);

    // Unsubscribing stores the position too.
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_FALSE, 3), SA_OK);
    EXPECT_EQ(tableNow()[0].LastEventRead, 3u);
    SaHpiBoolT subscribed = SAHPI_TRUE;
    EXPECT_EQ(kviCsGetSessionEventSubscription(id, &subscribed), SA_OK);
    EXPECT_EQ(subscribed, SAHPI_FALSE);

    // Any non-zero request subscribes and is stored as SAHPI_TRUE.
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, 2, 4), SA_OK);
    EXPECT_EQ(kviCsGetSessionEventSubscription(id, &subscribed), SA_OK);
    EXPECT_EQ(subscribed, SAHPI_TRUE);
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 4), SA_ERR_HPI_DUPLICATE);
}

TEST_F(SessionTest, InitializeClearsSlotsButKeepsPositionsAndIds)
{
    const SaHpiSessionIdT a = open();
    ASSERT_EQ(kviCsAddConnectionToSession(a, 6), SA_OK);
    subscribe(a, 23);
    ASSERT_EQ(kviCsSessionInitialize(), SA_OK);
    const KviSessionIdsT slot = tableNow()[0];
    EXPECT_EQ(slot.InUse, SAHPI_FALSE);
    EXPECT_EQ(slot.ConnDesc, 0);
    EXPECT_EQ(slot.EventSubscribed, SAHPI_FALSE);
    EXPECT_EQ(slot.SessionId, 0u);
    EXPECT_EQ(slot.LastEventRead, 23u);
    EXPECT_EQ(kviCsSessionValidate(a), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(open(), a + 1);
}

TEST_F(SessionTest, NullOutputsAreRefusedBeforeTheSemaphore)
{
    const SaHpiSessionIdT id = open();
    subscribe(id);
    const Table before = tableNow();
    {
        HeldTable held; // a call that touched the semaphore would time out
        const auto start = std::chrono::steady_clock::now();
        EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsGetDomainFromSession(id, nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsGetConnectionFromSession(id, nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsGetSessionLastEvent(id, nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_EQ(kviCsGetSessionEventSubscription(id, nullptr), SA_ERR_HPI_INVALID_PARAMS);
        EXPECT_LT(std::chrono::steady_clock::now() - start, std::chrono::milliseconds(250));
    }
    for (const char *text :
         {"SessionId pointer is NULL.", "Domain pointer is NULL.", "ConnDesc pointer is NULL.",
          "LastEventRead pointer is NULL.", "EventSubscribe pointer is NULL."}) {
        SCOPED_TRACE(text);
        EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, text));
    }
    expectSameTable(before, tableNow());
}

TEST_F(SessionTest, UnknownAndClosedIdsAreRefused)
{
    const SaHpiSessionIdT closed = open();
    ASSERT_EQ(kviCsSessionClose(closed), SA_OK);
    const SaHpiSessionIdT live = open();
    subscribe(live, 8);
    const Table before = tableNow();

    for (SaHpiSessionIdT id : {closed, SaHpiSessionIdT{4000000}}) {
        SCOPED_TRACE(id);
        log.clear();
        SaHpiDomainIdT domain = 0;
        SaHpiInt32T conn = 0;
        SaHpiUint32T last = 0;
        SaHpiBoolT subscribed = 0;
        EXPECT_EQ(kviCsSessionValidate(id), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(kviCsGetDomainFromSession(id, &domain), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM,
                             "kviCsSessionValidate failed. sess=" + std::to_string(id)));
        EXPECT_EQ(kviCsAddConnectionToSession(id, 5), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM,
                             "Can't add connection to a closed session! SessionId(" +
                                 std::to_string(id) + ") index(-1)"));
        EXPECT_EQ(kviCsGetConnectionFromSession(id, &conn), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(kviCsSetSessionLastEvent(id, 1), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 1), SA_ERR_HPI_INVALID_SESSION);
        EXPECT_EQ(kviCsGetSessionEventSubscription(id, &subscribed), SA_ERR_HPI_INVALID_SESSION);
        // Every lookup that finds no open slot says the same.
        EXPECT_EQ(log.matching("Invalid Session").size(), 5u);
        EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "Invalid Session"));
    }
    EXPECT_EQ(kviCsCloseAllSessionsToConnection(99), SA_OK);
    expectSameTable(before, tableNow());
    EXPECT_EQ(signalCalls, 0);
}

TEST_F(SessionTest, SemaphoreTimeoutIsAnErrorAndChangesNothing)
{
    const SaHpiSessionIdT id = open();
    subscribe(id);
    const Table before = tableNow();
    struct Call {
        const char *function;
        SaHpiUint32T level;
        SaErrorT (*run)(SaHpiSessionIdT);
    };
    static const Call calls[] = {
        {"kviCsSessionOpen", KVI_LOG_ERR_NONFATAL_NUM,
         [](SaHpiSessionIdT) {
             SaHpiSessionIdT s;
             return kviCsSessionOpen(0, &s);
         }},
        {"kviCsSessionValidate", KVI_LOG_ERR_NONFATAL_NUM,
         [](SaHpiSessionIdT s) { return kviCsSessionValidate(s); }},
        {"kviCsSessionClose", KVI_LOG_ERR_NONFATAL_NUM,
         [](SaHpiSessionIdT s) { return kviCsSessionClose(s); }},
        {"kviCsAddConnectionToSession", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT s) { return kviCsAddConnectionToSession(s, 1); }},
        {"kviCsGetConnectionFromSession", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT s) {
             SaHpiInt32T c;
             return kviCsGetConnectionFromSession(s, &c);
         }},
        {"kviCsCloseAllSessionsToConnection", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT) { return kviCsCloseAllSessionsToConnection(0); }},
        {"kviCsCloseAllSessions", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT) { return kviCsCloseAllSessions(); }},
        {"kviCsSetSessionLastEvent", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT s) { return kviCsSetSessionLastEvent(s, 1); }},
        {"kviCsGetSessionLastEvent", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT s) {
             SaHpiUint32T l;
             return kviCsGetSessionLastEvent(s, &l);
         }},
        {"kviCsSetSessionEventSubscription", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT s) { return kviCsSetSessionEventSubscription(s, SAHPI_FALSE, 0); }},
        {"kviCsGetSessionEventSubscription", KVI_LOG_WARN_NUM,
         [](SaHpiSessionIdT s) {
             SaHpiBoolT b;
             return kviCsGetSessionEventSubscription(s, &b);
         }},
    };
    constexpr size_t count = sizeof calls / sizeof calls[0];
    std::array<SaErrorT, count> results{};
    {
        HeldTable held;
        // All wait at once, so the test costs one timeout, not eleven.
        std::vector<std::thread> threads;
        for (size_t i = 0; i < count; i++)
            threads.emplace_back([&, i] { results[i] = calls[i].run(id); });
        for (std::thread &t : threads)
            t.join();
    }
    for (size_t i = 0; i < count; i++) {
        SCOPED_TRACE(calls[i].function);
        EXPECT_EQ(results[i], SA_ERR_HPI_ERROR);
        EXPECT_TRUE(
            loggedAt(log, calls[i].level, "kviCsSemWait failed.  rc=-1006", calls[i].function));
    }
    expectSameTable(before, tableNow());
    EXPECT_EQ(signalCalls, 0);
    SaHpiDomainIdT domain = 0;
    EXPECT_EQ(kviCsGetDomainFromSession(id, &domain), SA_OK);
}

} // namespace
