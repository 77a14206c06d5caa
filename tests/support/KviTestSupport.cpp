#include "support/KviTestSupport.h"

#include <arpa/inet.h>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <unistd.h>

#include <gtest/gtest.h>

namespace
{
std::string makeTempDir()
{
    std::string pattern = (std::filesystem::temp_directory_path() / "kvi-test-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr)
        ADD_FAILURE() << "mkdtemp failed";
    return pattern;
}
} // namespace

KviLogCapture::KviLogCapture(KviCsLogLevelSettingT level)
{
    path_ = makeTempDir() + "/test.log";
    kviCsLogClose();
    EXPECT_EQ(kviCsLogInitialize(level, path_.c_str()), SA_OK);
}

KviLogCapture::~KviLogCapture()
{
    kviCsLogClose();
    std::error_code ignored;
    std::filesystem::remove_all(std::filesystem::path(path_).parent_path(), ignored);
}

std::vector<std::string> KviLogCapture::lines() const
{
    std::ifstream in(path_);
    std::vector<std::string> out;
    for (std::string line; std::getline(in, line);)
        out.push_back(line);
    return out;
}

std::vector<std::string> KviLogCapture::matching(std::string_view text) const
{
    std::vector<std::string> out;
    for (auto &line : lines())
        if (line.find(text) != std::string::npos)
            out.push_back(line);
    return out;
}

void KviLogCapture::clear()
{
    std::ofstream(path_, std::ios::trunc);
}

KviTempDir::KviTempDir() : path_(makeTempDir()) {}

KviTempDir::~KviTempDir()
{
    std::error_code ignored;
    std::filesystem::remove_all(path_, ignored);
}

std::string KviTempDir::write(std::string_view name, std::string_view contents) const
{
    std::string p = file(name);
    std::ofstream(p, std::ios::binary | std::ios::trunc) << contents;
    return p;
}

SaHpiInt32T kviTestLiveBlocks()
{
    SaHpiInt32T n = 0;
    kviCsGetMemorySegmentsAllocated(&n);
    return n;
}

KviLoopback::KviLoopback()
{
    EXPECT_EQ(kviCsOpenSvrComm(0, 4, &listener), SA_OK);
    sockaddr_in local{};
    socklen_t length = sizeof local;
    EXPECT_EQ(getsockname(listener, reinterpret_cast<sockaddr *>(&local), &length), 0);
    port = ntohs(local.sin_port);
    EXPECT_EQ(kviCsOpenClientComm(port, "127.0.0.1", &client), SA_OK);
    EXPECT_EQ(kviCsAcceptConnection(listener, &server), SA_OK);
}

KviLoopback::~KviLoopback()
{
    for (SaHpiInt32T desc : {client, server, listener})
        if (desc >= 0)
            close(desc);
}
