#include <gtest/gtest.h>

#include <ctime>
#include <random>

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

TEST(KviTime, BreakdownAgreesWithTheCLibraryOverTheWholeRange)
{
    std::mt19937 random(2026);
    std::uniform_int_distribution<SaHpiUint32T> seconds(0, 0xFFFFFFFFu);
    for (int i = 0; i < 20000; ++i) {
        SaHpiUint32T s = seconds(random);
        struct tm ours, theirs;
        time_t asTime = static_cast<time_t>(s);
        ASSERT_EQ(kviCsTimeGetGmTimeNoLogging(s, &ours), SA_OK);
        ASSERT_NE(gmtime_r(&asTime, &theirs), nullptr);
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
