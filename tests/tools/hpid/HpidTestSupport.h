// kvi-hpid as the tests and benchmarks meet it: the daemon started on a free
// port of 127.0.0.1 with the simulated shelf, and the client library loaded
// beside the library that the test itself hosts.
#pragma once

#include <dlfcn.h>
#include <poll.h>
#include <signal.h>
#include <stdio.h>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <chrono>
#include <string>
#include <thread>

#include "SaHpi.h"

// The shelf both the daemon and an in-process library serve.
inline std::string kviHpidShelfConfig(const std::string &Simulator, const std::string &NvDir)
{
    return "mapl_modules = \"" + Simulator + "\"\nKviSimProcessorBoards = \"2\"\n" +
           "KviSimFanTrays = \"1\"\nKviSimFans = \"2\"\nKviSimPowerSupplies = \"1\"\n" +
           "KviNvStorageDir = \"" + NvDir + "\"\nKviEntitySchemaId = \"ATCA\"\n";
}

class KviHpid
{
  public:
    // Starts the daemon; Port 0 lets it pick one. port() is 0 when it did
    // not come up.
    KviHpid(const std::string &Config, const std::string &Log, int Port = 0)
    {
        int out[2];
        if (pipe(out) != 0)
            return;
        pid_ = fork();
        if (pid_ == 0) {
            // A test that dies must not leave its daemon holding the output
            // that the test runner waits on.
            prctl(PR_SET_PDEATHSIG, SIGKILL);
            dup2(out[1], 1);
            close(out[0]);
            const std::string port = std::to_string(Port);
            execl(KVI_HPID_PATH, "kvi-hpid", "--config", Config.c_str(), "--port", port.c_str(),
                  "--log", Log.c_str(), static_cast<char *>(nullptr));
            _exit(127);
        }
        close(out[1]);
        // The daemon says where it listens once it serves.
        pollfd p = {out[0], POLLIN, 0};
        char line[128] = {};
        if (pid_ > 0 && poll(&p, 1, 60000) == 1 && read(out[0], line, sizeof line - 1) > 0)
            sscanf(line, "kvi-hpid: listening on %*[0-9.]:%d", &port_);
        close(out[0]);
    }
    ~KviHpid()
    {
        if (pid_ > 0)
            stop(SIGKILL);
    }
    KviHpid(const KviHpid &) = delete;
    KviHpid &operator=(const KviHpid &) = delete;

    int port() const { return port_; }

    // Sends Signal and waits: the exit status, or 128 + the signal that
    // ended it.
    int stop(int Signal)
    {
        int status = 0;
        kill(pid_, Signal);
        waitpid(pid_, &status, 0);
        pid_ = -1;
        return WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
    }

  private:
    pid_t pid_ = -1;
    int port_ = 0;
};

// The client library, loaded apart from the library linked into the test;
// call its functions through KVI_REMOTE(handle, saHpiX).
inline void *kviHpiClientOpen(int Port)
{
    setenv("KVI_HPI_SERVER", "127.0.0.1", 1);
    setenv("KVI_HPI_PORT", std::to_string(Port).c_str(), 1);
    return dlopen(KVI_HPI_CLIENT_PATH, RTLD_NOW | RTLD_LOCAL);
}
#define KVI_REMOTE(Handle, Fn) reinterpret_cast<decltype(&Fn)>(dlsym((Handle), #Fn))

template <typename Pred> bool kviHpidWaitFor(Pred Done, int TimeoutMs = 10000)
{
    const auto end = std::chrono::steady_clock::now() + std::chrono::milliseconds(TimeoutMs);
    while (!Done()) {
        if (std::chrono::steady_clock::now() > end)
            return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    return true;
}
