// saHpiSensorReadingGet over loopback: a client of libKviHpiClient against
// kvi-hpid on the simulated shelf, with 1 and 8 client threads (each call
// takes a connection of its own), beside the same call in process and the
// floor: the same request and response sizes bounced over plain POSIX
// sockets, one echo thread per connection as the daemon has. Each run
// reports the median and 99th percentile round trip of its calls.
#include <benchmark/benchmark.h>

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <climits>
#include <mutex>
#include <thread>
#include <vector>

#include "support/KviTestSupport.h"
#include "tools/hpid/HpidTestSupport.h"

namespace
{

std::string besideProgram(const char *Relative)
{
    char self[PATH_MAX] = "";
    const ssize_t n = readlink("/proc/self/exe", self, sizeof self - 1);
    std::string dir = std::string(self, n > 0 ? n : 0);
    return dir.substr(0, dir.rfind('/')) + Relative;
}

// The daemon and the client library, and the same shelf in process.
struct Setup {
    KviTempDir dir;
    KviHpid *daemon = nullptr;
    void *client = nullptr;
    decltype(&saHpiSensorReadingGet) remoteRead = nullptr;
    SaHpiSessionIdT remote = 0, local = 0;

    Setup()
    {
        const std::string simulator = besideProgram("/../plugins/libKviSimulator.so");
        daemon = new KviHpid(dir.write("hpid.conf", kviHpidShelfConfig(simulator, dir.file("r"))),
                             dir.file("hpid.log"));
        client = kviHpiClientOpen(daemon->port());
        SaHpiVersionT version;
        if (daemon->port() == 0 || client == nullptr ||
            KVI_REMOTE(client, saHpiInitialize)(&version) != SA_OK ||
            KVI_REMOTE(client, saHpiSessionOpen)(0, &remote, nullptr) != SA_OK) {
            fprintf(stderr, "kvi-hpid did not start (log in %s)\n", dir.file("hpid.log").c_str());
            abort();
        }
        remoteRead = KVI_REMOTE(client, saHpiSensorReadingGet);
        kviCsConfigInit(
            SAHPI_FALSE,
            dir.write("local.conf", kviHpidShelfConfig(simulator, dir.file("l"))).c_str());
        kviDsApiRedirectorInitialize();
        saHpiInitialize(&version);
        saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &local, nullptr);
        saHpiResourcesDiscover(local);
    }
    ~Setup()
    {
        KVI_REMOTE(client, saHpiFinalize)();
        daemon->stop(SIGTERM);
        delete daemon;
    }
};
Setup &setup()
{
    static Setup s;
    return s;
}

// Round-trip times of all threads of one run, in microseconds.
struct Latencies {
    std::mutex mutex;
    std::vector<double> all;
    void add(const std::vector<double> &Mine)
    {
        std::lock_guard<std::mutex> lock(mutex);
        all.insert(all.end(), Mine.begin(), Mine.end());
    }
    void report(benchmark::State &State)
    {
        std::lock_guard<std::mutex> lock(mutex);
        if (all.empty())
            return;
        std::sort(all.begin(), all.end());
        State.counters["p50_us"] = all[all.size() / 2];
        State.counters["p99_us"] = all[all.size() * 99 / 100];
        all.clear();
    }
};
Latencies latencies;

template <typename Call> void timedCalls(benchmark::State &State, Call &&C)
{
    std::vector<double> mine;
    for (auto _ : State) {
        const auto start = std::chrono::steady_clock::now();
        if (!C())
            State.SkipWithError("call failed");
        mine.push_back(
            std::chrono::duration<double, std::micro>(std::chrono::steady_clock::now() - start)
                .count());
    }
    latencies.add(mine);
    State.SetItemsProcessed(State.iterations());
    if (State.thread_index() == 0)
        latencies.report(State);
}

void BM_RemoteSensorReadingGet(benchmark::State &State)
{
    Setup &s = setup();
    SaHpiSensorReadingT reading;
    timedCalls(State, [&] { return s.remoteRead(s.remote, 2, 1, &reading) == SA_OK; });
}
BENCHMARK(BM_RemoteSensorReadingGet)->Threads(1)->Threads(8)->UseRealTime();

void BM_InProcessSensorReadingGet(benchmark::State &State)
{
    Setup &s = setup();
    SaHpiSensorReadingT reading;
    timedCalls(State, [&] { return saHpiSensorReadingGet(s.local, 2, 1, &reading) == SA_OK; });
}
BENCHMARK(BM_InProcessSensorReadingGet)->Threads(1)->UseRealTime();

// The floor: a request of the size the client sends, answered with a
// response of the size the daemon sends, by an echo thread per connection.
constexpr size_t REQUEST = 38, RESPONSE = 30 + sizeof(SaHpiSensorReadingT);

struct Floor {
    int listener = socket(AF_INET, SOCK_STREAM, 0);
    sockaddr_in address{};

    Floor()
    {
        address.sin_family = AF_INET;
        address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
        socklen_t length = sizeof address;
        if (bind(listener, reinterpret_cast<sockaddr *>(&address), sizeof address) != 0 ||
            listen(listener, 64) != 0 ||
            getsockname(listener, reinterpret_cast<sockaddr *>(&address), &length) != 0)
            abort();
        std::thread([this] {
            for (int conn; (conn = accept(listener, nullptr, nullptr)) >= 0;)
                std::thread(echo, conn).detach();
        }).detach();
    }
    static void echo(int Conn)
    {
        char in[REQUEST], out[RESPONSE] = {};
        while (recv(Conn, in, sizeof in, MSG_WAITALL) == ssize_t(sizeof in))
            send(Conn, out, sizeof out, MSG_NOSIGNAL);
        close(Conn);
    }
    int connectOne() const
    {
        int fd = socket(AF_INET, SOCK_STREAM, 0);
        int one = 1;
        setsockopt(fd, IPPROTO_TCP, TCP_NODELAY, &one, sizeof one);
        if (connect(fd, reinterpret_cast<const sockaddr *>(&address), sizeof address) != 0)
            abort();
        return fd;
    }
};

void BM_FloorLoopbackRoundTrip(benchmark::State &State)
{
    static Floor floor;
    const int fd = floor.connectOne();
    char in[RESPONSE], out[REQUEST] = {};
    timedCalls(State, [&] {
        return send(fd, out, sizeof out, MSG_NOSIGNAL) == ssize_t(sizeof out) &&
               recv(fd, in, sizeof in, MSG_WAITALL) == ssize_t(sizeof in);
    });
    close(fd);
}
BENCHMARK(BM_FloorLoopbackRoundTrip)->Threads(1)->Threads(8)->UseRealTime();

} // namespace
