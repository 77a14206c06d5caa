#include <gtest/gtest.h>

#include <fstream>
#include <iterator>
#include <regex>
#include <string>

#include "core/utils/KviTrace.h"
#include "support/KviTestSupport.h"

namespace
{
// Runs first in a fresh process: nothing has initialized logging yet.
TEST(LoggingBeforeInitialize, EveryLineIsLostWithAnError)
{
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    EXPECT_EXIT(
        {
            // The logger itself: inside the library the level test drops the
            // line before the call.
            bool lost = kviCsLogger(KVI_LOG_ERR_NONFATAL, "nowhere") == SA_ERR_HPI_ERROR;
            exit(lost ? 7 : 0);
        },
        testing::ExitedWithCode(7), "");
}

TEST(Logging, LineCarriesLabelLevelStampPidThreadAndPosition)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    ASSERT_EQ(KVI_WLOG(KVI_LOG_WARN, "disk %s is %d%% full", "nv", 93), SA_OK);
    auto lines = log.matching("is 93% full");
    ASSERT_EQ(lines.size(), 1u);
    SaHpiUint32T tid = 0;
    kviCsThreadNum(&tid);
    char tidText[16];
    snprintf(tidText, sizeof tidText, "%x", tid);
    std::regex format(R"(^ Warn    004 \d{4}/\d\d/\d\d \d\d:\d\d:\d\d\.\d{3} Pid:\d+ Tid:)" +
                      std::string(tidText) +
                      R"( \S*LoggingTest\.cpp \S+\(\) #\d+ disk nv is 93% full$)");
    EXPECT_TRUE(std::regex_match(lines[0], format)) << lines[0];
}

TEST(Logging, ThresholdAndFlagsFilterIndependently)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    KVI_DLOG(KVI_LOG_DBG_H, "level two");
    KVI_ILOG(KVI_LOG_INFO, "level three");
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "level five");
    KVI_FLOG(KVI_LOG_FUNC_IN, "entry without flag");
    KVI_SLOG(KVI_LOG_SEM, "sem without flag");
    EXPECT_FALSE(log.contains("level two"));
    EXPECT_TRUE(log.contains("  Info   003"));
    EXPECT_TRUE(log.contains("level five"));
    EXPECT_FALSE(log.contains("entry without flag"));
    EXPECT_FALSE(log.contains("sem without flag"));

    ASSERT_EQ(kviCsSetLogLevel(KVI_LOG_ERR_FATAL_NUM | KVI_LOG_FUNC_IN_NUM), SA_OK);
    KVI_FLOG(KVI_LOG_FUNC_IN, "entry with flag");
    KVI_FLOG(KVI_LOG_FUNC_OUT, "exit without flag");
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "five under six");
    EXPECT_TRUE(log.contains("   +In   032 "));
    EXPECT_TRUE(log.contains("Function entry: entry with flag"));
    EXPECT_FALSE(log.contains("exit without flag"));
    EXPECT_FALSE(log.contains("five under six"));
}

TEST(Logging, MixedOrUnknownLevelsAreWrittenAsInvalid)
{
    KviLogCapture log(KVI_LOG_ERR_FATAL_NUM);
    kviCsLogger(__FILE__, __LINE__, __func__, 0x23, "mixed");
    kviCsLogger(__FILE__, __LINE__, __func__, 0x07, "seven");
    kviCsLogger(__FILE__, __LINE__, __func__, 0x00, "zero");
    auto mixed = log.matching("mixed");
    ASSERT_EQ(mixed.size(), 1u);
    EXPECT_EQ(mixed[0].rfind("INVALID ERROR LEVEL 000 ", 0), 0u) << mixed[0];
    EXPECT_TRUE(log.contains("zero"));
    // A numeric 7 passes a threshold of 6 but has no label of its own.
    EXPECT_EQ(log.matching("seven").at(0).rfind("INVALID ERROR LEVEL 007 ", 0), 0u);
    EXPECT_EQ(kviCsSetLogLevel(KVI_LOG_ERR_FATAL_NUM | 0x80), SA_OK);
    kviCsLogger(__FILE__, __LINE__, __func__, 0x90, "two flags");
    EXPECT_EQ(log.matching("two flags").at(0).rfind("INVALID ERROR LEVEL 144 ", 0), 0u);
}

TEST(Logging, LongMessageIsAnnouncedAndCut)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    std::string big(3000, 'x');
    KVI_ILOG(KVI_LOG_INFO, "%s", big.c_str());
    auto lines = log.lines();
    size_t at = 0;
    while (at < lines.size() && lines[at] != "<The following line has been truncated>")
        ++at;
    ASSERT_LT(at + 1, lines.size());
    const std::string &cut = lines[at + 1];
    EXPECT_EQ(cut.size() - cut.find_first_of('x'), 2047u);

    log.clear();
    std::string fits(2047, 'y');
    KVI_ILOG(KVI_LOG_INFO, "%s", fits.c_str());
    EXPECT_FALSE(log.contains("truncated"));
}

TEST(Logging, InitializeValidatesLevelAndRefusesADuplicate)
{
    KviTempDir dir;
    KviLogCapture log(KVI_LOG_INFO_NUM);
    testing::internal::CaptureStderr();
    EXPECT_EQ(kviCsLogInitialize(7, dir.file("x.log").c_str()), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLogInitialize(0x60, dir.file("x.log").c_str()), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLogInitialize(3, dir.file("x.log").c_str()), SA_ERR_HPI_DUPLICATE);
    std::string err = testing::internal::GetCapturedStderr();
    EXPECT_NE(err.find("Internal Error #1001"), std::string::npos);
    EXPECT_NE(err.find("Invalid log level of 7 passed to kviCsLogInitialize."), std::string::npos);
    EXPECT_NE(err.find("Internal Error #1005"), std::string::npos);
    EXPECT_TRUE(log.contains("** Logging has been initialized **"));

    EXPECT_EQ(kviCsLogClose(), SA_OK);
    EXPECT_EQ(kviCsLogClose(), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(KVI_ELOG(KVI_LOG_ERR_NONFATAL, "while closed"), SA_ERR_HPI_ERROR);
    testing::internal::CaptureStderr();
    EXPECT_EQ(kviCsLogInitialize(3, nullptr), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLogInitialize(3, "/nonexistent-dir/x.log"), SA_ERR_HPI_ERROR);
    err = testing::internal::GetCapturedStderr();
    EXPECT_NE(err.find("#1002"), std::string::npos);
    EXPECT_NE(err.find("Cannot open file /nonexistent-dir/x.log, No such file"),
              std::string::npos);

    // Reopening after any number of failures still gives one working writer.
    ASSERT_EQ(kviCsLogInitialize(0x63, dir.file("y.log").c_str()), SA_OK);
    KVI_FLOG(KVI_LOG_FUNC_OUT, "traced");
    KVI_DLOG(KVI_LOG_DBG_H, "dropped");
    ASSERT_EQ(kviCsLogClose(), SA_OK);
    KviLogCapture reread(KVI_LOG_INFO_NUM);
    std::ifstream in(dir.file("y.log"));
    std::string all((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_NE(all.find("Function exit: traced"), std::string::npos);
    EXPECT_EQ(all.find("dropped"), std::string::npos);
}

TEST(Logging, SetLogLevelRejectsInvalidNumbers)
{
    KviLogCapture log(KVI_LOG_INFO_NUM);
    EXPECT_EQ(kviCsSetLogLevel(0x80), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsSetLogLevel(9), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Invalid log level of 128 passed to kviCsSetLogLevel"));
    KVI_ILOG(KVI_LOG_INFO, "still at three");
    EXPECT_TRUE(log.contains("still at three"));
}

TEST(Logging, NullArgumentsAreRefused)
{
    KviLogCapture log;
    EXPECT_EQ(kviCsLogger(nullptr, 1, "f", 3, "m"), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLogger("f", 1, nullptr, 3, "m"), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_EQ(kviCsLogger("f", 1, "f", 3, nullptr), SA_ERR_HPI_INVALID_PARAMS);
}

struct HelperCase {
    const char *options;
    KviCsLogLevelSettingT expected;
    bool warns;
};

TEST(LoggingHelper, OptionStringsPickLevelAndFlags)
{
    const HelperCase cases[] = {
        {" -l2 -lf -ls", 0xE2, false}, {"-l3-lm", 0x13, false}, {"-l5 -l4", 0x04, false},
        {"-lx", 3, true},             {"-l9", 3, true},         {"-lf", 3, true},
        {"", 3, true},                {nullptr, 3, true},       {"-l0", 3, true},
        {"-l3 junk", 3, true},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.options ? c.options : "(null)");
        KviTempDir dir;
        kviCsLogClose();
        kviCsLogInitHelper(dir.file("h.log").c_str(), c.options);
        // Probe the level that was set: the threshold, then each flag.
        KVI_DLOG(KVI_LOG_DBG_L, "probe1");
        KVI_DLOG(KVI_LOG_DBG_H, "probe2");
        KVI_ILOG(KVI_LOG_INFO, "probe3");
        KVI_WLOG(KVI_LOG_WARN, "probe4");
        KVI_MLOG(KVI_LOG_MEM, "probeMem");
        KVI_SLOG(KVI_LOG_SEM, "probeSem");
        KVI_FLOG(KVI_LOG_FUNC_IN, "probeIn");
        kviCsLogClose();
        std::ifstream in(dir.file("h.log"));
        std::string all((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
        auto has = [&](const char *t) { return all.find(t) != std::string::npos; };
        KviCsLogLevelSettingT seen = 0;
        for (int n = 4; n >= 1; --n)
            if (has(("probe" + std::to_string(n)).c_str()))
                seen = static_cast<KviCsLogLevelSettingT>(n);
        if (has("probeMem"))
            seen |= 0x10;
        if (has("probeSem"))
            seen |= 0x80;
        if (has("probeIn"))
            seen |= 0x60;
        EXPECT_EQ(seen, c.expected);
        EXPECT_EQ(has("Invalid logging options specified:"), c.warns);
    }
}

TEST(LoggingHelper, NullFileNameLeavesLoggingOff)
{
    kviCsLogClose();
    kviCsLogInitHelper(nullptr, "-l3");
    EXPECT_EQ(kviCsLogClose(), SA_ERR_HPI_INVALID_REQUEST);
}

TEST(Logging, TracerWritesEntryAndExitLines)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_IN_NUM | KVI_LOG_FUNC_OUT_NUM);
    {
        KVI_TRACE("arg=%d", 42);
        trace.exitMessage("Done it");
    }
    EXPECT_TRUE(log.contains("Function entry: arg=42"));
    EXPECT_TRUE(log.contains("Function exit: Done it"));
}
} // namespace
