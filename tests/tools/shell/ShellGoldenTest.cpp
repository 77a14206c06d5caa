// kvi-hpi-shell run as a child process on the simulator: a script's output
// against a golden file, times and event-log entry numbers masked; bad
// input; and the remote mode up to the loading of the client library.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <regex>
#include <sstream>
#include <string>

#include "../hpid/HpidTestSupport.h"

namespace
{

std::string readFile(const std::string &Path)
{
    std::ifstream in(Path);
    std::stringstream text;
    text << in.rdbuf();
    return text.str();
}

// Files of this run of the test, so that runs side by side keep apart.
std::string scratch(const std::string &Name)
{
    return "/tmp/kvi-shell-test-" + std::to_string(getpid()) + "-" + Name;
}

struct ScratchCleanup : testing::Environment {
    void TearDown() override { EXPECT_EQ(system(("rm -rf " + scratch("*")).c_str()), 0); }
};
const auto *scratchCleanup = testing::AddGlobalTestEnvironment(new ScratchCleanup);

// The example configuration with a store of the test's own.
std::string configFile()
{
    std::string config =
        std::regex_replace(readFile(KVI_SHELL_EXAMPLE), std::regex("KviNvStorageDir = \"[^\"]*\""),
                           "KviNvStorageDir = \"" + scratch("nv") + "\"");
    std::string path = scratch("conf");
    std::ofstream(path) << config;
    return path;
}

struct RunT {
    std::string Output;
    int Status;
};

RunT runShell(const std::string &Arguments, const std::string &Environment = "")
{
    std::string command = "cd " KVI_SHELL_BUILD_DIR " && " + Environment + " " KVI_SHELL_PATH " " +
                          Arguments + " 2>&1";
    FILE *pipe = popen(command.c_str(), "r");
    RunT run{"", -1};
    char buffer[4096];
    for (size_t n; (n = fread(buffer, 1, sizeof buffer, pipe)) > 0;)
        run.Output.append(buffer, n);
    int status = pclose(pipe);
    run.Status = WIFEXITED(status) ? WEXITSTATUS(status) : -1;
    return run;
}

std::string masked(const std::string &Output)
{
    std::string out = std::regex_replace(
        Output, std::regex("[0-9]{4}-[0-9]{2}-[0-9]{2} [0-9:]{8}\\.[0-9]{3}"), "<time>");
    return std::regex_replace(out, std::regex("\n[0-9]+ +<time>"), "\n<entry> <time>");
}

TEST(ShellGoldenTest, ScriptOnTheSimulatorPrintsTheGoldenTables)
{
    ASSERT_EQ(system(("rm -rf " + scratch("nv")).c_str()), 0);
    std::string dir = KVI_SHELL_TEST_DIR;
    RunT run = runShell("--config " + configFile() + " " + dir + "/tour.hsh");
    EXPECT_EQ(run.Status, 0) << run.Output;
    std::string expected = readFile(dir + "/tour.golden");
    if (getenv("KVI_UPDATE_GOLDEN") != nullptr)
        std::ofstream(dir + "/tour.golden") << masked(run.Output);
    EXPECT_EQ(masked(run.Output), expected);
}

TEST(ShellGoldenTest, BadInputIsOneLineEachAndTheShellGoesOn)
{
    const struct {
        const char *Command;
        const char *Line;
    } cases[] = {
        {"bogus", "unknown command \"bogus\"; \"help\" lists the commands\n"},
        {"sensor read 2", "usage: sensor read RID NUM\n"},
        {"sensor read 2 x", "sensor: \"x\" is not a number\n"},
        {"sensor read 2 300", "sensor: 300 is out of range (0 to 255)\n"},
        {"sensor read 99 1", "resource: no resource 99 (\"resources\" lists them)\n"},
        {"sensor read 2 9", "sensor: no sensor 9 on resource 2\n"},
        {"record 2 77", "record: no record 77 on resource 2\n"},
        {"sensor read {NOSUCH,1} 1",
         "resource: \"{NOSUCH,1}\" is not an entity path like {SYSTEM_CHASSIS,1}\n"},
        {"severity 2 LOUD", nullptr},
    };
    std::string config = configFile();
    for (const auto &c : cases) {
        SCOPED_TRACE(c.Command);
        RunT run = runShell("--config " + config + " -e '" + c.Command + "' -e schema");
        EXPECT_EQ(run.Status, 1);
        if (c.Line != nullptr) {
            EXPECT_EQ(run.Output.substr(0, run.Output.find('\n') + 1), c.Line);
        }
        EXPECT_NE(run.Output.find("entity schema"), std::string::npos) << "the shell went on";
    }
}

TEST(ShellGoldenTest, RemoteModeChecksTheServerAndLoadsTheClientLibrary)
{
    RunT bad = runShell("--remote localhost -e resources");
    EXPECT_EQ(bad.Status, 1);
    EXPECT_EQ(bad.Output, "kvi-hpi-shell: --remote wants HOST:PORT, not \"localhost\"\n");
    RunT missing = runShell("--remote 127.0.0.1:4743 -e resources",
                            "KVI_HPI_CLIENT_LIB=/nonexistent/libKviHpiClient.so");
    EXPECT_EQ(missing.Status, 1);
    EXPECT_NE(missing.Output.find("cannot load the client library: /nonexistent"),
              std::string::npos)
        << missing.Output;
    EXPECT_EQ(runShell("--remote h:1 --config x").Status, 2);
}

TEST(ShellGoldenTest, RemoteModeShowsWhatTheShellHostingTheLibraryShows)
{
    // The daemon works from wherever the test runs: its plug-in by full path.
    const std::string config =
        std::regex_replace(readFile(configFile()), std::regex("mapl_modules = \"[^\"]*\""),
                           "mapl_modules = \"" KVI_SHELL_BUILD_DIR "/plugins/libKviSimulator.so\"");
    const std::string daemonConfig = scratch("daemon.conf");
    std::ofstream(daemonConfig) << std::regex_replace(config, std::regex(scratch("nv")),
                                                      scratch("daemon-nv"));
    ASSERT_EQ(system(("rm -rf " + scratch("nv") + " " + scratch("daemon-nv")).c_str()), 0);
    KviHpid daemon(daemonConfig, scratch("daemon.log"));
    ASSERT_NE(daemon.port(), 0);
    const std::string commands = " -e resources -e 'resource 2' -e 'sensor read 2 1' -e 'inventory "
                                 "2 5' -e 'hotswap state 2'";
    RunT local = runShell("--config " + configFile() + commands);
    RunT remote = runShell("--remote 127.0.0.1:" + std::to_string(daemon.port()) + commands,
                           "KVI_HPI_CLIENT_LIB=" KVI_HPI_CLIENT_PATH);
    EXPECT_EQ(local.Status, 0) << local.Output;
    EXPECT_EQ(remote.Status, 0) << remote.Output;
    EXPECT_EQ(remote.Output, local.Output);
    EXPECT_EQ(daemon.stop(SIGTERM), 0);
}

} // namespace
