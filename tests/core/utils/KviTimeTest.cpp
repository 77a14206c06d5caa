#include <gtest/gtest.h>

#include <chrono>
#include <fcntl.h>
#include <random>
#include <sys/stat.h>

#include "core/utils/KviClock.h"
#include "support/KviTestSupport.h"

SaErrorT kviCsTimeGetTimeNoLoggingForTest(SaHpiUint32T Seconds, SaHpiInt32T Offset,
                                          struct tm *TimeStruct) noexcept;

namespace
{
TEST(KviTime, BreakdownOfKnownDates)
{
    struct tm t;
    ASSERT_EQ(kviCsTimeGetGmTimeNoLogging(0, &t), SA_OK);
    EXPECT_EQ(t.tm_year, 70);
    EXPECT_EQ(t.tm_mon, 0);
    EXPECT_EQ(t.tm_mday, 1);
    EXPECT_EQ(t.tm_wday, 4);
    EXPECT_EQ(t.tm_yday, 0);
    EXPECT_EQ(t.tm_isdst, -1);

    ASSERT_EQ(kviCsTimeGetGmTimeNoLogging(951782400u, &t), SA_OK); // 2000-02-29
    EXPECT_EQ(t.tm_mon, 1);
    EXPECT_EQ(t.tm_mday, 29);
    EXPECT_EQ(t.tm_yday, 59);

    EXPECT_EQ(kviCsTimeGetTimeNoLoggingForTest(0, 43201, &t), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsTimeGetTimeNoLoggingForTest(0, -43201, &t), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsTimeGetGmTimeNoLogging(0, nullptr), SA_ERR_HPI_INVALID_PARAMS);

    // Before the epoch: the last day of 1969, with the time of day kept.
    ASSERT_EQ(kviCsTimeGetTimeNoLoggingForTest(3600, -7200, &t), SA_OK);
    EXPECT_EQ(t.tm_year, 69);
    EXPECT_EQ(t.tm_yday, 364);
    EXPECT_EQ(t.tm_hour, 23);
}

// The standard library's calendar in 64-bit arithmetic: right on both word
// sizes, where gmtime with a 32-bit time_t wraps in 2038.
struct tm referenceBreakdown(SaHpiUint32T Seconds)
{
    using namespace std::chrono;
    sys_seconds time{seconds{Seconds}};
    sys_days day = floor<days>(time);
    year_month_day date{day};
    hh_mm_ss clock{time - day};
    struct tm t {
    };
    t.tm_year = static_cast<int>(date.year()) - 1900;
    t.tm_mon = static_cast<int>(static_cast<unsigned>(date.month())) - 1;
    t.tm_mday = static_cast<int>(static_cast<unsigned>(date.day()));
    t.tm_yday = static_cast<int>((day - sys_days{date.year() / January / 1}).count());
    t.tm_wday = static_cast<int>(weekday{day}.c_encoding());
    t.tm_hour = static_cast<int>(clock.hours().count());
    t.tm_min = static_cast<int>(clock.minutes().count());
    t.tm_sec = static_cast<int>(clock.seconds().count());
    return t;
}

TEST(KviTime, BreakdownAgreesWithTheCalendarOverTheWholeRange)
{
    std::mt19937 random(2026);
    std::uniform_int_distribution<SaHpiUint32T> seconds(0, 0xFFFFFFFFu);
    for (int i = 0; i < 20000; ++i) {
        SaHpiUint32T s = i == 0 ? 0x80000000u : seconds(random); // the first: 2038-01-19
        struct tm ours;
        struct tm theirs = referenceBreakdown(s);
        ASSERT_EQ(kviCsTimeGetGmTimeNoLogging(s, &ours), SA_OK);
        if (theirs.tm_year >= 200)
            continue; // past 2099 the missing century rule is known and accepted
        ASSERT_EQ(ours.tm_year, theirs.tm_year) << s;
        ASSERT_EQ(ours.tm_yday, theirs.tm_yday) << s;
        ASSERT_EQ(ours.tm_mon, theirs.tm_mon) << s;
        ASSERT_EQ(ours.tm_mday, theirs.tm_mday) << s;
        ASSERT_EQ(ours.tm_wday, theirs.tm_wday) << s;
        ASSERT_EQ(ours.tm_hour * 3600 + ours.tm_min * 60 + ours.tm_sec,
                  theirs.tm_hour * 3600 + theirs.tm_min * 60 + theirs.tm_sec)
            << s;
    }
}

// 2040-02-29 12:34:56.123 UTC, past the 32-bit time_t's end in January 2038.
constexpr long long LEAP_DAY_2040 = 2214131696LL;
long long frozenMonotonic = -1; // -1: the real monotonic clock

int frozenClock(clockid_t Clock, struct timespec *Now)
{
    if (Clock == CLOCK_MONOTONIC && frozenMonotonic < 0)
        return clock_gettime(Clock, Now);
    Now->tv_sec = static_cast<time_t>(Clock == CLOCK_MONOTONIC ? frozenMonotonic : LEAP_DAY_2040);
    Now->tv_nsec = 123456789;
    return 0;
}

// The wall clock stands in 2040 for the object's lifetime.
struct WallClockIn2040 {
    WallClockIn2040() { kviCsClockRead = frozenClock; }
    ~WallClockIn2040()
    {
        kviCsClockRead = clock_gettime;
        frozenMonotonic = -1;
    }
};

TEST(KviTime, ReadingsAndDeadlinesPastJanuary2038)
{
    static_assert(sizeof(time_t) == 8 && sizeof(off_t) == 8);
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_SEM_NUM);
    WallClockIn2040 clock;
    SaHpiTimeT hpi = 0;
    ASSERT_EQ(kviCsGetSaHpiTime(&hpi), SA_OK);
    EXPECT_EQ(hpi, LEAP_DAY_2040 * 1000000000LL + 123000000LL);
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "a line in 2040");
    EXPECT_TRUE(log.contains("2040/02/29 12:34:56.123 "));

    // Lock deadlines do not follow the wall clock: a wait still lasts its
    // timeout, through the logged, quiet and deadline forms.
    KviCsSemaphore sem;
    ASSERT_EQ(KVI_CS_SEM_INIT(&sem, 0), SA_OK);
    auto start = std::chrono::steady_clock::now();
    EXPECT_EQ(KVI_CS_SEM_WAIT(&sem, 200), SA_ERR_HPI_TIMEOUT);
    EXPECT_EQ(KVI_CS_SEM_NL_WAIT(&sem, 200), SA_ERR_HPI_TIMEOUT);
    struct timespec deadline;
    ASSERT_EQ(kviCsConvertTimeoutToTimespec(200, &deadline), SA_OK);
    EXPECT_EQ(kviCsSemWaitTime(&sem, &deadline), SA_ERR_HPI_TIMEOUT);
    auto waited = std::chrono::steady_clock::now() - start;
    EXPECT_GE(waited, std::chrono::milliseconds(590));
    EXPECT_LT(waited, std::chrono::seconds(3));
    EXPECT_FALSE(log.contains("Can't honor requested timeout!"));
    // The range guard still counts the deadline clock's seconds (the logger
    // cannot write then: its own semaphore refuses the same way).
    frozenMonotonic = 0x7FFFFFFF - 1000;
    EXPECT_EQ(KVI_CS_SEM_WAIT(&sem, 200), SA_ERR_HPI_ERROR);
    frozenMonotonic = -1;
    EXPECT_EQ(KVI_CS_SEM_DESTROY(&sem), SA_OK);

    KviTempDir dir;
    std::string path = dir.write("f.txt", "hello");
    const struct timespec times[2] = {{LEAP_DAY_2040, 0}, {LEAP_DAY_2040, 0}};
    ASSERT_EQ(utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
    SaHpiInt64T mtime = 0;
    ASSERT_EQ(kviCsGetFileInfo(path.c_str(), &mtime, nullptr), SA_OK);
    EXPECT_EQ(mtime, LEAP_DAY_2040 * 1000000000LL);
}

TEST(KviTime, ClockReadings)
{
    KviLogCapture log;
    SaHpiTimeT hpi = 0;
    ASSERT_EQ(kviCsGetSaHpiTime(&hpi), SA_OK);
    EXPECT_EQ(hpi % 1000000, 0);
    EXPECT_GT(hpi, 1700000000LL * 1000000000LL);
    SaHpiUint32T s = 0, ms = 0;
    ASSERT_EQ(kviCsGetSecondsAndMilliseconds(&s, &ms), SA_OK);
    EXPECT_LT(ms, 1000u);
    EXPECT_NEAR(static_cast<double>(s), static_cast<double>(hpi / 1000000000LL), 2.0);
    EXPECT_EQ(kviCsGetSaHpiTime(nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsGetSecondsAndMilliseconds(&s, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsGetSecondsAndMillisecondsNoLogging(nullptr, &ms), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("MSeconds pointer is NULL."));
    EXPECT_TRUE(log.contains("Time pointer is NULL."));
}

TEST(KviFile, InformationInHpiTimeAndBytes)
{
    KviLogCapture log;
    KviTempDir dir;
    std::string path = dir.write("f.txt", "hello");
    SaHpiInt64T mtime = 0;
    SaHpiInt32T size = 0;
    ASSERT_EQ(kviCsGetFileInfo(path.c_str(), &mtime, &size), SA_OK);
    EXPECT_EQ(size, 5);
    EXPECT_EQ(mtime % 1000000000LL, 0);
    EXPECT_GT(mtime, 0);
    EXPECT_EQ(kviCsGetFileInfo(path.c_str(), nullptr, nullptr), SA_OK);
    EXPECT_EQ(kviCsGetFileInfo(dir.file("missing").c_str(), &mtime, &size), SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("stat returned No such file or directory"));
    EXPECT_EQ(kviCsGetFileInfo(nullptr, &mtime, &size), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("FileName pointer is NULL."));
}
} // namespace
