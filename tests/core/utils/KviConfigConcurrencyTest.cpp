// Queries racing reloads: a reader must see either the whole old list or the
// whole new one, never a list being built or freed.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstdio>
#include <string>
#include <thread>
#include <vector>

#include <sys/time.h>

#include "core/utils/KviConfig.h"
#include "support/KviTestSupport.h"

namespace
{
using namespace std::chrono_literals;

// Two generations of one file, of equal size, that differ in every value.
std::string generation(char tag)
{
    std::string text;
    for (int i = 1000; i < 1200; ++i)
        text += "key" + std::to_string(i) + " = \"" + tag + std::to_string(i) + "\"\n";
    return text;
}

// Readers of the first and the last key, counting what they saw.
struct Readers {
    explicit Readers(KviCsCfgContainer *container)
    {
        for (const char *key : {"key1000", "key1199"})
            threads.emplace_back([this, container, key] { read(container, key); });
    }
    ~Readers() { stop(); }
    void stop()
    {
        done = true;
        for (auto &t : threads)
            if (t.joinable())
                t.join();
    }
    void read(KviCsCfgContainer *container, const char *key)
    {
        const std::string a = std::string("A") + (key + 3), b = std::string("B") + (key + 3);
        while (!done) {
            char value[16];
            SaErrorT rc = kviCsCfgDataGet(key, sizeof value, value, container);
            bool ok = rc == SA_OK;
            ++(ok && value == a ? seenA : ok && value == b ? seenB : bad);
            if (!(ok && (value == a || value == b)))
                lastBad = rc;
            // The semaphore is not fair: a reader that asks again at once
            // could starve the other reader and the watcher past their waits.
            std::this_thread::sleep_for(50us);
        }
    }
    std::atomic<bool> done{false};
    std::atomic<int> seenA{0}, seenB{0}, bad{0};
    std::atomic<SaErrorT> lastBad{SA_OK};
    std::vector<std::thread> threads;
};

// Written aside and renamed, so a load never meets a half-written file.
void rewrite(const KviTempDir &dir, char tag, long shift)
{
    std::string aside = dir.write("next.conf", generation(tag));
    struct timeval times[2] = {{1000000000L + shift, 0}, {1000000000L + shift, 0}};
    ASSERT_EQ(utimes(aside.c_str(), times), 0);
    ASSERT_EQ(rename(aside.c_str(), dir.file("kvi.conf").c_str()), 0);
}

std::atomic<int> reloads{0};
void countReload()
{
    reloads++;
}

TEST(KviConfigConcurrency, ReadersSeeWholeListsWhileReloadsSwapThem)
{
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", generation('A'));
    KviCsCfgContainer cont;
    ASSERT_EQ(kviCsConfigInitStructure(&cont, SAHPI_FALSE, path.c_str()), SA_OK);
    SaHpiInt32T base = kviTestLiveBlocks();
    {
        Readers readers(&cont);
        for (int i = 0; i < 40; ++i) {
            dir.write("kvi.conf", generation(i % 2 == 0 ? 'B' : 'A'));
            ASSERT_EQ(kviCsConfigProcessChanges(&cont), SA_OK);
            std::this_thread::sleep_for(2ms);
        }
        readers.stop();
        EXPECT_EQ(readers.bad, 0) << "last result " << readers.lastBad;
        EXPECT_GT(readers.seenA, 0);
        EXPECT_GT(readers.seenB, 0);
    }
    EXPECT_EQ(kviTestLiveBlocks(), base);
    EXPECT_EQ(kviCsConfigFinalizeStrucure(&cont), SA_OK);
}

TEST(KviConfigConcurrency, ReadersAndCallbacksWhileTheWatcherReloads)
{
    KviTempDir dir;
    std::string path = dir.write("kvi.conf", generation('A'));
    KviCsCfgContainer cont;
    ASSERT_EQ(kviCsConfigInitStructure(&cont, SAHPI_TRUE, path.c_str()), SA_OK);
    ASSERT_EQ(kviCsConfigRegister(countReload, &cont), SA_OK);
    reloads = 0;
    {
        Readers readers(&cont);
        auto deadline = std::chrono::steady_clock::now() + 5s;
        for (int round = 0; round < 2; ++round) {
            int before = reloads;
            rewrite(dir, round == 0 ? 'B' : 'A', round);
            while (reloads <= before && std::chrono::steady_clock::now() < deadline)
                std::this_thread::sleep_for(20ms);
        }
        readers.stop();
        EXPECT_GE(reloads.load(), 2);
        EXPECT_EQ(readers.bad, 0) << "last result " << readers.lastBad;
        EXPECT_GT(readers.seenA, 0);
    }
    EXPECT_EQ(kviCsConfigUnregister(countReload, &cont), SA_OK);
    // Finalization refuses while the watcher runs the callbacks: try again.
    SaErrorT rc = SA_ERR_HPI_INVALID_REQUEST;
    for (int i = 0; i < 50 && rc == SA_ERR_HPI_INVALID_REQUEST;
         ++i, std::this_thread::sleep_for(5ms))
        rc = kviCsConfigFinalizeStrucure(&cont);
    EXPECT_EQ(rc, SA_OK);
}
} // namespace
