#include "core/SaHpi/session/Session.h"

#include <array>
#include <atomic>
#include <chrono>
#include <functional>
#include <string>
#include <thread>
#include <tuple>
#include <vector>

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{
using Table = std::array<KviSessionIdsT, KVI_CS_MAX_SESSIONS>;
using std::to_string;
using Clock = std::chrono::steady_clock;

// What the hook saw, and whether the closed session could already be looked
// up from inside it (only possible once the table's semaphore is free).
std::atomic<int> signalCalls{0};
std::atomic<SaErrorT> signalResult{SA_OK};
std::atomic<SaHpiSessionIdT> watched{0};
std::atomic<SaErrorT> validateInSignal{SA_OK};

SaErrorT recordingSignal()
{
    signalCalls++;
    validateInSignal = kviCsSessionValidate(watched);
    return signalResult;
}

auto fields(const KviSessionIdsT &s)
{
    return std::tuple(s.InUse, s.DomainId, s.ConnDesc, s.EventSubscribed, s.LastEventRead,
                      s.SessionId);
}

Table tableNow()
{
    Table t{};
    EXPECT_EQ(kviCsSessionTableCopy(t.data()), SA_OK);
    return t;
}

void expectTableIs(const Table &expected)
{
    Table now = tableNow();
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++)
        EXPECT_TRUE(fields(now[i]) == fields(expected[i])) << "slot " << i;
}

// A line with the text at the level (as the logger labels it), written by
// the function when one is named.
bool loggedAt(const KviLogCapture &log, SaHpiUint32T level, const std::string &text,
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

// Holds the table's semaphore, so every operation that waits for it times out.
struct HeldTable {
    HeldTable() { EXPECT_EQ(KVI_CS_SEM_WAIT(kviCsSessionSemaphore(), 0), SA_OK); }
    ~HeldTable() { EXPECT_EQ(KVI_CS_SEM_POST(kviCsSessionSemaphore()), SA_OK); }
};

// A call of the table's interface, named as the log names it.
struct Call {
    const char *function;
    std::function<SaErrorT()> run;
};
#define KVI_CALL(function, ...)                                                                    \
    Call                                                                                           \
    {                                                                                              \
#function, [&] { return function(__VA_ARGS__); }                                           \
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
        log.clear();
    }
    void TearDown() override { kviCsSessionSetSignalHook(previousHook_); }

    static SaHpiSessionIdT open(SaHpiInt32T conn = 0, bool subscribed = false)
    {
        SaHpiSessionIdT id = 0;
        EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id), SA_OK);
        EXPECT_TRUE(conn == 0 || kviCsAddConnectionToSession(id, conn) == SA_OK);
        EXPECT_TRUE(!subscribed || kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 0) == SA_OK);
        return id;
    }

    KviLogCapture log{KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_OUT_NUM};

  private:
    KviCsSessionSignalFnT previousHook_ = nullptr;
};

TEST(SessionStartTest, FirstIdOfAProcessIs1000AndInitializeDoesNotRestartIds)
{
    // A re-executed child starts from the library's initial state.
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            SaHpiSessionIdT a = 0;
            SaHpiSessionIdT b = 0;
            kviCsSessionInitialize();
            kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &a);
            kviCsSessionInitialize();
            kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &b);
            exit(a == 1000 && b == 1001 ? 1 : 2);
        },
        testing::ExitedWithCode(1), "");
}

TEST_F(SessionTest, EndOfTheIdSpaceIsFatal)
{
    // Only the child moves the counter, so later tests keep fresh ids.
    EXPECT_EXIT(
        {
            SaHpiSessionIdT id = 0;
            kviCsSessionSetNextId(0xFFFFFFFEu);
            if (kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id) != SA_OK || id != 0xFFFFFFFEu)
                exit(2);
            kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id);
            exit(3);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_FATAL_NUM, "Session Limit Reached, fatal error"));
}

TEST_F(SessionTest, IdsIncreaseLowestFreeSlotIsTakenFullTableSpendsNoId)
{
    std::vector<SaHpiSessionIdT> ids;
    for (int i = 0; i < KVI_CS_MAX_SESSIONS; i++)
        ids.push_back(open());
    EXPECT_EQ(ids.back() - ids.front(), KVI_CS_MAX_SESSIONS - 1u);
    EXPECT_TRUE(log.contains("Function exit: Session(" + to_string(ids[7]) + ")"));

    const Table full = tableNow();
    SaHpiSessionIdT extra = 0;
    EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &extra), SA_ERR_HPI_DATA_EX_LIMITS);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "Out of space-- can't open another session."));
    expectTableIs(full);

    ASSERT_EQ(kviCsSessionClose(ids[1]), SA_OK);
    ASSERT_EQ(kviCsSessionClose(ids[4]), SA_OK);
    EXPECT_EQ(open(), ids.back() + 1);
    EXPECT_EQ(tableNow()[1].SessionId, ids.back() + 1);
    EXPECT_EQ(tableNow()[4].InUse, SAHPI_FALSE);
    // Validate's walk names slots by index + 1000, not by the id in them.
    EXPECT_EQ(kviCsSessionValidate(ids.back() + 1), SA_OK);
    EXPECT_TRUE(log.contains("Function exit: Valid session"));
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_L_NUM, "Session 1001: 1, Domain 0, ConnDesc 0"));

    // A closed id stays invalid, and closing it again is a duplicate close.
    EXPECT_EQ(kviCsSessionValidate(ids[4]), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_TRUE(log.contains("Function exit: Invalid session"));
    const Table before = tableNow();
    EXPECT_EQ(kviCsSessionClose(ids[4]), SA_ERR_HPI_DUPLICATE);
    EXPECT_EQ(kviCsSessionClose(ids[4] + 5000), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, "Can't close a closed session!"));
    expectTableIs(before);
}

TEST_F(SessionTest, CloseSignalsReadersOnlyForSubscribedSessionsAfterReleasingTheTable)
{
    ASSERT_EQ(kviCsSessionClose(open(12)), SA_OK);
    EXPECT_EQ(signalCalls, 0);

    const SaHpiSessionIdT id = open(12, true);
    ASSERT_EQ(kviCsSetSessionLastEvent(id, 42), SA_OK);
    watched = id;
    ASSERT_EQ(kviCsSessionClose(id), SA_OK);
    EXPECT_EQ(signalCalls, 1);
    EXPECT_EQ(validateInSignal, SA_ERR_HPI_INVALID_SESSION);
    // Subscription and position stay in the slot; the next open drops only
    // the subscription.
    EXPECT_TRUE(fields(tableNow()[0]) == std::tuple(0, 0u, 0, 1, 42u, 0u));
    open();
    EXPECT_TRUE(std::tuple(tableNow()[0].EventSubscribed, tableNow()[0].LastEventRead) ==
                std::tuple(SAHPI_FALSE, 42u));

    const SaHpiSessionIdT failing = open(0, true);
    signalResult = SA_ERR_HPI_TIMEOUT;
    EXPECT_EQ(kviCsSessionClose(failing), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "kviCsSignalEventThreads failed.  rc=-1006",
                         "kviCsSessionClose"));
    EXPECT_EQ(kviCsSessionValidate(failing), SA_ERR_HPI_INVALID_SESSION);
}

TEST_F(SessionTest, ConnectionsAndClosingThemAll)
{
    const SaHpiSessionIdT a = open(7), b = open(8), c = open(7);
    SaHpiInt32T conn = 0;
    ASSERT_EQ(kviCsAddConnectionToSession(b, 9), SA_OK); // replaces 8
    EXPECT_EQ(kviCsGetConnectionFromSession(b, &conn), SA_OK);
    EXPECT_EQ(conn, 9);
    SaHpiDomainIdT domain = 9;
    EXPECT_EQ(kviCsGetDomainFromSession(b, &domain), SA_OK);
    EXPECT_EQ(domain, SAHPI_DEFAULT_DOMAIN_ID);

    EXPECT_EQ(kviCsCloseAllSessionsToConnection(7), SA_OK);
    EXPECT_EQ(signalCalls, 0); // nobody was subscribed
    EXPECT_EQ(kviCsSessionValidate(a), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSessionValidate(b), SA_OK);
    EXPECT_EQ(kviCsSessionValidate(c), SA_ERR_HPI_INVALID_SESSION);
    // Dead without InUse, the id stays.
    EXPECT_TRUE(std::tuple(tableNow()[2].SessionId, tableNow()[2].ConnDesc) == std::tuple(c, 0));

    const SaHpiSessionIdT d = open(3, true), e = open(3, true);
    signalResult = SA_ERR_HPI_ERROR;
    EXPECT_EQ(kviCsCloseAllSessionsToConnection(3), SA_ERR_HPI_ERROR);
    EXPECT_EQ(signalCalls, 1); // one wake-up for the whole connection
    EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM, "kviCsSemWait failed.  rc=-1001",
                         "kviCsCloseAllSessionsToConnection"));
    EXPECT_EQ(kviCsSessionValidate(d), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSessionValidate(e), SA_ERR_HPI_INVALID_SESSION);

    // Close-all clears InUse only: id and connection stay, and the next
    // session in that slot inherits the connection.
    signalResult = SA_OK;
    ASSERT_EQ(kviCsSetSessionEventSubscription(b, SAHPI_TRUE, 0), SA_OK);
    EXPECT_EQ(kviCsCloseAllSessions(), SA_OK);
    EXPECT_EQ(signalCalls, 2);
    EXPECT_TRUE(std::tuple(tableNow()[1].InUse, tableNow()[1].SessionId, tableNow()[1].ConnDesc) ==
                std::tuple(0, b, 9));
    const SaHpiSessionIdT f = open(), g = open(0, true);
    EXPECT_EQ(kviCsGetConnectionFromSession(g, &conn), SA_OK);
    EXPECT_EQ(conn, 9);
    signalResult = SA_ERR_HPI_BUSY;
    EXPECT_EQ(kviCsCloseAllSessions(), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_WARN_NUM, "kviCsSemWait failed.  rc=-1003", "kviCsCloseAllSessions"));
    EXPECT_EQ(kviCsSessionValidate(f), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsCloseAllSessions(), SA_OK); // nothing open, no signal
    EXPECT_EQ(signalCalls, 3);
}

TEST_F(SessionTest, SubscriptionStateAndReadPosition)
{
    const SaHpiSessionIdT id = open();
    SaHpiUint32T last = 0;
    SaHpiBoolT subscribed = SAHPI_TRUE;
    EXPECT_EQ(kviCsSetSessionLastEvent(id, 5), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_FALSE, 0), SA_ERR_HPI_INVALID_REQUEST);
    for (const char *text : {"Can't set the TimeStamp without a subscription!",
                             "Can't get the TimeStamp without a subscription!",
                             "This Session is not currently subscribed for events!"})
        EXPECT_TRUE(loggedAt(log, KVI_LOG_DBG_H_NUM, text)) << text;

    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 17), SA_OK);
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_TRUE, 30), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(
        loggedAt(log, KVI_LOG_DBG_H_NUM, "This Session has already subscribed for events!"));
    EXPECT_EQ(kviCsGetSessionLastEvent(id, &last), SA_OK);
    EXPECT_EQ(last, 17u); // the refused subscribe changed nothing

    // Unsubscribing stores the position too; any non-zero request subscribes.
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, SAHPI_FALSE, 3), SA_OK);
    EXPECT_EQ(tableNow()[0].LastEventRead, 3u);
    EXPECT_EQ(kviCsGetSessionEventSubscription(id, &subscribed), SA_OK);
    EXPECT_EQ(subscribed, SAHPI_FALSE);
    EXPECT_EQ(kviCsSetSessionEventSubscription(id, 2, 4), SA_OK);
    EXPECT_EQ(kviCsGetSessionEventSubscription(id, &subscribed), SA_OK);
    EXPECT_EQ(subscribed, SAHPI_TRUE);

    // Start-up clears every slot except the read position.
    ASSERT_EQ(kviCsSessionInitialize(), SA_OK);
    EXPECT_TRUE(fields(tableNow()[0]) == std::tuple(0, 0u, 0, 0, 4u, 0u));
}

TEST_F(SessionTest, UnknownAndClosedIdsAreRefused)
{
    const SaHpiSessionIdT closed = open();
    ASSERT_EQ(kviCsSessionClose(closed), SA_OK);
    open(5, true);
    const Table before = tableNow();
    SaHpiDomainIdT domain;
    SaHpiInt32T conn;
    SaHpiUint32T last;
    SaHpiBoolT subscribed;
    for (SaHpiSessionIdT id : {closed, SaHpiSessionIdT{4000000}}) {
        SCOPED_TRACE(id);
        log.clear();
        for (const Call &call : {KVI_CALL(kviCsGetDomainFromSession, id, &domain),
                                 KVI_CALL(kviCsAddConnectionToSession, id, 5),
                                 KVI_CALL(kviCsGetConnectionFromSession, id, &conn),
                                 KVI_CALL(kviCsSetSessionLastEvent, id, 1),
                                 KVI_CALL(kviCsGetSessionLastEvent, id, &last),
                                 KVI_CALL(kviCsSetSessionEventSubscription, id, SAHPI_TRUE, 1),
                                 KVI_CALL(kviCsGetSessionEventSubscription, id, &subscribed)})
            EXPECT_EQ(call.run(), SA_ERR_HPI_INVALID_SESSION) << call.function;
        EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM,
                             "kviCsSessionValidate failed. sess=" + to_string(id)));
        EXPECT_TRUE(loggedAt(log, KVI_LOG_WARN_NUM,
                             "Can't add connection to a closed session! SessionId(" +
                                 to_string(id) + ") index(-1)"));
        // Every other lookup that finds no open slot says the same.
        EXPECT_EQ(log.matching("Invalid Session").size(), 5u);
        EXPECT_TRUE(loggedAt(log, KVI_LOG_ERR_NONFATAL_NUM, "Invalid Session"));
    }
    EXPECT_EQ(kviCsCloseAllSessionsToConnection(99), SA_OK);
    expectTableIs(before);
}

TEST_F(SessionTest, WithTheTableHeldBadArgumentsAreRefusedAtOnceAndWaitsTimeOut)
{
    SaHpiSessionIdT id = open(0, true);
    SaHpiSessionIdT opened;
    SaHpiInt32T conn;
    SaHpiUint32T last;
    SaHpiBoolT subscribed;
    const Table before = tableNow();
    const SaHpiUint32T error = KVI_LOG_ERR_NONFATAL_NUM;
    // Refused before the semaphore, with the result and the line logged.
    const std::tuple<Call, SaErrorT, SaHpiUint32T, const char *> refused[] = {
        {KVI_CALL(kviCsSessionOpen, 0, nullptr), SA_ERR_HPI_INVALID_PARAMS, error,
         "SessionId pointer is NULL."},
        {KVI_CALL(kviCsGetDomainFromSession, id, nullptr), SA_ERR_HPI_INVALID_PARAMS, error,
         "Domain pointer is NULL."},
        {KVI_CALL(kviCsGetConnectionFromSession, id, nullptr), SA_ERR_HPI_INVALID_PARAMS, error,
         "ConnDesc pointer is NULL."},
        {KVI_CALL(kviCsGetSessionLastEvent, id, nullptr), SA_ERR_HPI_INVALID_PARAMS, error,
         "LastEventRead pointer is NULL."},
        {KVI_CALL(kviCsGetSessionEventSubscription, id, nullptr), SA_ERR_HPI_INVALID_PARAMS, error,
         "EventSubscribe pointer is NULL."},
        {KVI_CALL(kviCsSessionOpen, 1, &opened), SA_ERR_HPI_INVALID_DOMAIN, KVI_LOG_DBG_H_NUM,
         "Invalid domain: 1"},
        {KVI_CALL(kviCsSessionValidate, 999), SA_ERR_HPI_INVALID_SESSION, KVI_LOG_DBG_H_NUM,
         "Invalid session 999 passed in. "},
        {KVI_CALL(kviCsSessionClose, 0), SA_ERR_HPI_INVALID_SESSION, KVI_LOG_DBG_H_NUM,
         "Invalid session 0 passed in. "},
    };
    // Open, validate and close log a failed wait as an error, the rest warn.
    const Call waiting[] = {
        KVI_CALL(kviCsSessionOpen, 0, &opened),
        KVI_CALL(kviCsSessionValidate, id),
        KVI_CALL(kviCsSessionClose, id),
        KVI_CALL(kviCsAddConnectionToSession, id, 1),
        KVI_CALL(kviCsGetConnectionFromSession, id, &conn),
        KVI_CALL(kviCsCloseAllSessionsToConnection, 0),
        KVI_CALL(kviCsCloseAllSessions),
        KVI_CALL(kviCsSetSessionLastEvent, id, 1),
        KVI_CALL(kviCsGetSessionLastEvent, id, &last),
        KVI_CALL(kviCsSetSessionEventSubscription, id, SAHPI_FALSE, 0),
        KVI_CALL(kviCsGetSessionEventSubscription, id, &subscribed),
    };
    std::array<SaErrorT, std::size(waiting)> results{};
    {
        HeldTable held;
        const auto start = Clock::now();
        for (const auto &[call, rc, level, message] : refused) {
            EXPECT_EQ(call.run(), rc) << message;
            EXPECT_TRUE(loggedAt(log, level, message, call.function)) << message;
        }
        // A wait for the semaphore lasts 500 ms.
        EXPECT_LT(Clock::now() - start, std::chrono::milliseconds(250));
        // All wait at once: the test costs one timeout, not eleven.
        std::vector<std::thread> threads;
        for (size_t i = 0; i < std::size(waiting); i++)
            threads.emplace_back([&, i] { results[i] = waiting[i].run(); });
        for (std::thread &t : threads)
            t.join();
    }
    for (size_t i = 0; i < std::size(waiting); i++) {
        EXPECT_EQ(results[i], SA_ERR_HPI_ERROR) << waiting[i].function;
        EXPECT_TRUE(loggedAt(log, i < 3 ? error : KVI_LOG_WARN_NUM,
                             "kviCsSemWait failed.  rc=-1006", waiting[i].function))
            << waiting[i].function;
    }
    expectTableIs(before);
    EXPECT_EQ(signalCalls, 0);
}

} // namespace
