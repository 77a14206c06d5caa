#include "core/SaHpi/events/EventManager.h"

#include <chrono>
#include <future>
#include <string>

#include <gtest/gtest.h>

#include "core/SaHpi/session/Session.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

namespace
{
using Clock = std::chrono::steady_clock;

// Events told apart by their timestamp.
SaHpiEventT event(SaHpiTimeT Mark)
{
    SaHpiEventT e{};
    e.EventType = SAHPI_ET_USER;
    e.Timestamp = Mark;
    return e;
}

struct Got {
    SaErrorT rc;
    SaHpiUint32T number;
    SaHpiTimeT mark;
};

Got get(SaHpiSessionIdT Session, SaHpiTimeoutT Timeout = SAHPI_TIMEOUT_IMMEDIATE)
{
    SaHpiEventT e{};
    SaHpiUint32T n = 0;
    SaErrorT rc = kviCsGetEvent(Session, Timeout, &e, &n);
    return {rc, n, e.Timestamp};
}

class EventManagerTest : public testing::Test
{
  protected:
    void SetUp() override { start(""); }
    void TearDown() override
    {
        kviCsCloseAllSessions();
        EXPECT_EQ(kviCsEventQueueFinalize(), SA_OK);
        kviCsConfigFinalize();
        EXPECT_EQ(kviTestLiveBlocks(), baseline_);
    }
    void start(const std::string &Config)
    {
        baseline_ = kviTestLiveBlocks();
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, dir_.write("eq.conf", Config).c_str()), SA_OK);
        ASSERT_EQ(kviCsSessionInitialize(), SA_OK);
        ASSERT_EQ(kviCsEventQueueInitialize(), SA_OK);
    }
    static SaHpiSessionIdT subscriber(SaHpiBoolT Alarms = SAHPI_FALSE, SaHpiUint32T At = 0)
    {
        SaHpiSessionIdT id = 0;
        EXPECT_EQ(kviCsSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &id), SA_OK);
        EXPECT_EQ(kviCsSubscribe(id, Alarms, &At), SA_OK);
        return id;
    }
    static SaHpiUint32T put(SaHpiTimeT First, int Count, SaHpiSessionIdT AlarmFor = 0)
    {
        std::vector<SaHpiEventT> events;
        for (int i = 0; i < Count; i++)
            events.push_back(event(First + i));
        SaHpiUint32T number = 0;
        EXPECT_EQ(kviCsPutEvent(0, events.data(), Count, AlarmFor != 0, AlarmFor, &number), SA_OK);
        return number;
    }
    // Reads Count events in order from the number and mark given.
    static void expectRun(SaHpiSessionIdT S, SaHpiUint32T Number, SaHpiTimeT Mark, int Count)
    {
        for (int i = 0; i < Count; i++, Number = Number == 0xFFFFFFFFu ? 1 : Number + 1) {
            Got g = get(S);
            ASSERT_TRUE(g.rc == SA_OK && g.number == Number && g.mark == Mark + i)
                << "event " << i << ": rc " << g.rc << " #" << g.number;
        }
        EXPECT_EQ(get(S).rc, SA_ERR_HPI_TIMEOUT);
    }

    KviTempDir dir_;
    KviLogCapture log_{KVI_LOG_DBG_L_NUM};
    SaHpiInt32T baseline_ = 0;
};

TEST_F(EventManagerTest, RingSizeComesFromTheConfigurationOrFallsBackTo100)
{
    struct Case {
        const char *config;
        SaHpiInt32T entries;
        const char *line;
    } cases[] = {
        {"", 100,
         "kviCsCfgDataGet returned failure on KviEventQueueSize key. Using default value of 100."},
        {"KviEventQueueSize = \"1\"\n", 100,
         "KviEventQueueSize of 1 is invalid. Value must be > 1. Using default value of 100."},
        {"KviEventQueueSize = \"2\"\n", 2, "Using KviEventQueueSize value of 2."},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.config);
        TearDown();
        log_.clear();
        start(c.config);
        EXPECT_EQ(kviCsEventQueueEntries(), c.entries);
        EXPECT_TRUE(log_.contains(c.line));
    }
}

TEST_F(EventManagerTest, NumbersStartAt2SkipZeroOnWrapAndNewSubscribersSeeOnlyLaterEvents)
{
    EXPECT_EQ(put(100, 1), 2u);
    SaHpiSessionIdT s = subscriber();
    EXPECT_EQ(put(101, 1), 3u);
    expectRun(s, 3, 101, 1);
    // A fresh ring whose numbers are about to wrap.
    ASSERT_EQ(kviCsEventQueueFinalize(), SA_OK);
    ASSERT_EQ(kviCsEventQueueInitialize(), SA_OK);
    ASSERT_EQ(kviCsEventQueueSetLastEventNumber(0xFFFFFFFDu), SA_OK);
    SaHpiSessionIdT w = subscriber();
    EXPECT_EQ(put(200, 4), 0xFFFFFFFEu);
    expectRun(w, 0xFFFFFFFEu, 200, 4); // then 0xFFFFFFFF, 1 and 2, never 0
}

TEST_F(EventManagerTest, OverflowDeliversTheOldestWithTruncatedOncePerGap)
{
    SaHpiSessionIdT s = subscriber();
    put(1000, 101); // one more than the ring holds: events 3 to 102 stay
    EXPECT_TRUE(log_.contains("Adding 101 events to an event queue that has only 100 entries.  "
                              "You just lost the first 1 events."));
    Got g = get(s);
    EXPECT_TRUE(g.rc == SA_ERR_HPI_DATA_TRUNCATED && g.number == 3 && g.mark == 1001);
    expectRun(s, 4, 1002, 99);
    for (int i = 0; i < 150; i++) // a reader 150 behind
        put(2000 + i, 1);
    g = get(s);
    EXPECT_TRUE(g.rc == SA_ERR_HPI_DATA_TRUNCATED && g.number == 153 && g.mark == 2050);
    expectRun(s, 154, 2051, 99);
}

TEST_F(EventManagerTest, ActiveAlarmsAreSkippedByOtherSessionsAndHandedOverOnResume)
{
    SaHpiSessionIdT a = subscriber(), b = subscriber();
    SaHpiUint32T first = put(10, 2, a);
    put(12, 1);
    expectRun(b, first + 2, 12, 1); // skipped, not lost: SA_OK
    expectRun(a, first, 10, 3);

    SaHpiUint32T alarms = put(30, 2, a);
    ASSERT_EQ(kviCsSessionClose(a), SA_OK);
    SaHpiUint32T at = alarms;
    EXPECT_EQ(kviCsSubscribe(b, SAHPI_TRUE, &at), SA_ERR_HPI_INVALID_PARAMS);
    SaHpiSessionIdT c = subscriber(SAHPI_FALSE, alarms); // resumes where a stood
    expectRun(c, alarms + 1, 31, 1);
    expectRun(b, 0, 0, 0); // not b's
}

TEST_F(EventManagerTest, ReadersWakeOnEventsCloseAndFinalizeAndTimeOutInTheirBound)
{
    SaHpiSessionIdT s = subscriber(), closing = subscriber(), idle = 0;
    ASSERT_EQ(kviCsSessionOpen(0, &idle), SA_OK);
    EXPECT_EQ(get(idle).rc, SA_ERR_HPI_INVALID_REQUEST); // no subscription
    EXPECT_EQ(kviCsUnsubscribe(idle), SA_ERR_HPI_INVALID_REQUEST);

    auto blocked = std::async(std::launch::async, [&] { return get(s, SAHPI_TIMEOUT_BLOCK); });
    EXPECT_EQ(blocked.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
    SaHpiUint32T n = put(7, 1);
    Got g = blocked.get();
    EXPECT_TRUE(g.rc == SA_OK && g.number == n);

    auto start = Clock::now();
    EXPECT_EQ(get(s, 200000000).rc, SA_ERR_HPI_TIMEOUT);
    EXPECT_GE(Clock::now() - start, std::chrono::milliseconds(200));
    EXPECT_LT(Clock::now() - start, std::chrono::seconds(5));

    EXPECT_EQ(get(closing).rc, SA_OK);
    blocked = std::async(std::launch::async, [&] { return get(closing, SAHPI_TIMEOUT_BLOCK); });
    EXPECT_EQ(blocked.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
    ASSERT_EQ(kviCsSessionClose(closing), SA_OK);
    EXPECT_EQ(blocked.get().rc, SA_ERR_HPI_INVALID_SESSION);

    blocked = std::async(std::launch::async, [&] { return get(s, SAHPI_TIMEOUT_BLOCK); });
    EXPECT_EQ(blocked.wait_for(std::chrono::milliseconds(50)), std::future_status::timeout);
    ASSERT_EQ(kviCsEventQueueFinalize(), SA_OK);
    EXPECT_EQ(blocked.get().rc, SA_ERR_HPI_ERROR);
    SaHpiEventT e = event(1);
    EXPECT_EQ(kviCsPutEvent(0, &e, 1, SAHPI_FALSE, 0, nullptr), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log_.contains("Event queue is being shutdown. Somebody isn't being very nice!"));
    ASSERT_EQ(kviCsEventQueueInitialize(), SA_OK); // for TearDown
}

TEST_F(EventManagerTest, BadArgumentsAreRefusedBeforeAnythingChanges)
{
    SaHpiEventT e = event(1);
    SaHpiUint32T n = 0;
    SaHpiSessionIdT s = subscriber();
    EXPECT_EQ(kviCsPutEvent(0, nullptr, 1, SAHPI_FALSE, 0, &n), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsPutEvent(0, &e, 0, SAHPI_FALSE, 0, &n), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsPutEvent(1, &e, 1, SAHPI_FALSE, 0, &n), SA_ERR_HPI_INVALID_DOMAIN);
    EXPECT_EQ(kviCsGetEvent(s, 0, nullptr, &n), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsGetEvent(s, 0, &e, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsGetEvent(999, 0, &e, &n), SA_ERR_HPI_INVALID_SESSION);
    EXPECT_EQ(kviCsSubscribe(s, SAHPI_FALSE, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    n = 0;
    EXPECT_EQ(kviCsSubscribe(s, 2, &n), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsSubscribe(s, SAHPI_FALSE, &n), SA_ERR_HPI_DUPLICATE);
    EXPECT_EQ(kviCsEventQueueCreate(1), SA_ERR_HPI_INVALID_DOMAIN);
    expectRun(s, 0, 0, 0);
}

TEST_F(EventManagerTest, OutOfMemoryForTheRingFailsInitializeAndLeaksNothing)
{
    ASSERT_EQ(kviCsEventQueueFinalize(), SA_OK);
    kviCsMemoryFailNthAllocation(1);
    EXPECT_EQ(kviCsEventQueueInitialize(), SA_ERR_HPI_ERROR);
    kviCsMemoryFailNthAllocation(0);
    EXPECT_TRUE(log_.contains("KVI_CS_MALLOC failed:"));
    EXPECT_TRUE(log_.contains("kviCsEventQueueCreate failed. rc=-1007"));
    ASSERT_EQ(kviCsEventQueueInitialize(), SA_OK);
}

} // namespace
