// The event queue: how fast plug-ins can put events (one and four writer
// threads) and how long a blocked subscriber waits from a put to its get
// (with 1 and 10 subscribers blocked). Beside each, the floor: the same ring
// work done with a plain pthread mutex and condition variable.
//
// Latency is reported as counters: median and 99th percentile in
// microseconds, measured from just before the put to the return of the get.
#include <pthread.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <thread>
#include <vector>

#include <benchmark/benchmark.h>

#include "core/SaHpi/events/EventManager.h"
#include "core/SaHpi/session/Session.h"
#include "support/KviTestSupport.h"

namespace
{
using Clock = std::chrono::steady_clock;

// The library set up once for the whole program: configuration (a ring of
// 1000), sessions and the queue.
struct Library {
    KviTempDir dir;
    Library()
    {
        kviCsConfigInit(SAHPI_FALSE,
                        dir.write("bench.conf", "KviEventQueueSize = \"1000\"\n").c_str());
        kviCsSessionInitialize();
        kviCsEventQueueInitialize();
    }
};
void setUp()
{
    static Library library;
}

void BM_KviPutEvent(benchmark::State &state)
{
    setUp();
    SaHpiEventT e{};
    for (auto _ : state)
        if (kviCsPutEvent(0, &e, 1, SAHPI_FALSE, 0, nullptr) != SA_OK) {
            state.SkipWithError("put failed");
            break;
        }
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_KviPutEvent)->UseRealTime();
BENCHMARK(BM_KviPutEvent)->Threads(4)->UseRealTime();

// The floor: the ring as plain pthread primitives would keep it.
struct PlainRing {
    pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
    pthread_cond_t cond = PTHREAD_COND_INITIALIZER;
    std::vector<KviCsEventT> slots = std::vector<KviCsEventT>(1000);
    size_t current = 0;
    SaHpiUint32T last = 1;

    void put(const SaHpiEventT &E)
    {
        pthread_mutex_lock(&mutex);
        current = current + 1 == slots.size() ? 0 : current + 1;
        slots[current].Event = E;
        last = last == 0xFFFFFFFFu ? 1 : last + 1;
        slots[current].EventNumber = last;
        pthread_mutex_unlock(&mutex);
        pthread_cond_broadcast(&cond);
    }
    // Waits for the event after LastRead (the ring never overflows here).
    SaHpiUint32T get(SaHpiUint32T LastRead, SaHpiEventT *E)
    {
        pthread_mutex_lock(&mutex);
        while (last == LastRead)
            pthread_cond_wait(&cond, &mutex);
        size_t at = current;
        while (slots[at].EventNumber != LastRead + 1)
            at = at == 0 ? slots.size() - 1 : at - 1;
        *E = slots[at].Event;
        pthread_mutex_unlock(&mutex);
        return LastRead + 1;
    }
};
PlainRing plainRing;

void BM_PlainPutEvent(benchmark::State &state)
{
    SaHpiEventT e{};
    for (auto _ : state)
        plainRing.put(e);
    state.SetItemsProcessed(state.iterations());
}
BENCHMARK(BM_PlainPutEvent)->UseRealTime();
BENCHMARK(BM_PlainPutEvent)->Threads(4)->UseRealTime();

// Put-to-get latency with `subscribers` readers blocked. Each event carries
// its put time; every reader records how long after that it held the event.
template <typename Get> void latency(benchmark::State &state, auto Put, Get MakeGetter)
{
    const int subscribers = static_cast<int>(state.range(0));
    std::vector<std::vector<double>> seen(subscribers);
    std::atomic<int> ready{0};
    std::atomic<SaHpiInt64T> rounds{-1};
    std::vector<std::thread> readers;
    for (int r = 0; r < subscribers; r++)
        readers.emplace_back([&, r] {
            auto get = MakeGetter();
            ready++;
            while (rounds.load() < 0)
                std::this_thread::yield();
            for (SaHpiInt64T i = 0; i < rounds.load(); i++) {
                SaHpiEventT e{};
                if (!get(&e))
                    return;
                auto now = Clock::now().time_since_epoch().count();
                seen[r].push_back(static_cast<double>(now - e.Timestamp) / 1000.0);
            }
        });
    while (ready.load() < subscribers)
        std::this_thread::yield();
    const SaHpiInt64T total = static_cast<SaHpiInt64T>(state.max_iterations);
    rounds = total;
    for (auto _ : state) {
        // Let every reader block again before the next put.
        std::this_thread::sleep_for(std::chrono::microseconds(200));
        SaHpiEventT e{};
        e.Timestamp = Clock::now().time_since_epoch().count();
        Put(e);
    }
    for (std::thread &t : readers)
        t.join();
    std::vector<double> all;
    for (auto &v : seen)
        all.insert(all.end(), v.begin(), v.end());
    std::sort(all.begin(), all.end());
    if (all.empty())
        return;
    state.counters["median_us"] = all[all.size() / 2];
    state.counters["p99_us"] = all[all.size() * 99 / 100];
}

void BM_KviPutToGetLatency(benchmark::State &state)
{
    setUp();
    latency(
        state, [](SaHpiEventT &E) { kviCsPutEvent(0, &E, 1, SAHPI_FALSE, 0, nullptr); },
        [] {
            SaHpiSessionIdT s = 0;
            SaHpiUint32T at = 0;
            kviCsSessionOpen(0, &s);
            kviCsSubscribe(s, SAHPI_FALSE, &at);
            return [s](SaHpiEventT *E) {
                SaHpiUint32T n = 0;
                SaErrorT rc = kviCsGetEvent(s, SAHPI_TIMEOUT_BLOCK, E, &n);
                return rc == SA_OK || rc == SA_ERR_HPI_DATA_TRUNCATED;
            };
        });
    kviCsCloseAllSessions();
}
BENCHMARK(BM_KviPutToGetLatency)->Arg(1)->Arg(10)->Iterations(2000)->UseRealTime();

void BM_PlainPutToGetLatency(benchmark::State &state)
{
    latency(
        state, [](SaHpiEventT &E) { plainRing.put(E); },
        [] {
            pthread_mutex_lock(&plainRing.mutex);
            SaHpiUint32T last = plainRing.last;
            pthread_mutex_unlock(&plainRing.mutex);
            return [last](SaHpiEventT *E) mutable {
                last = plainRing.get(last, E);
                return true;
            };
        });
}
BENCHMARK(BM_PlainPutToGetLatency)->Arg(1)->Arg(10)->Iterations(2000)->UseRealTime();

} // namespace
