// The load and unload hooks write only their entry and exit lines.
#include "daemon/lib/LibInit.h"

#include <gtest/gtest.h>

#include "support/KviTestSupport.h"

namespace
{

TEST(LibInit, HooksWriteOnlyTheirEntryAndExitLines)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM | KVI_LOG_FUNC_IN_NUM | KVI_LOG_FUNC_OUT_NUM);
    log.clear();
    kviDsLibraryLoaded();
    kviDsLibraryUnloaded();
    const std::vector<std::string> lines = log.lines();
    ASSERT_EQ(lines.size(), 4u);
    EXPECT_NE(lines[0].find("kviDsLibraryLoaded()"), std::string::npos);
    EXPECT_NE(lines[0].find(KVI_LOG_FUNCTION_ENTRY), std::string::npos);
    EXPECT_NE(lines[1].find(KVI_LOG_FUNCTION_EXIT), std::string::npos);
    EXPECT_NE(lines[2].find("kviDsLibraryUnloaded()"), std::string::npos);
    EXPECT_NE(lines[3].find(KVI_LOG_FUNCTION_EXIT), std::string::npos);
}

} // namespace
