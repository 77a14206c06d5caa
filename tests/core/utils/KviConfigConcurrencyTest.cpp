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
    for (int i = 0; i < 200; ++i)
        text +=
            "key" + std::to_string(1000 + i) + " = \"" + tag + std::to_string(1000 + i) + "\"\n";
    return text;
}

// Readers of the first and the last key, counting what they saw.
class Readers
{
  public:
    explicit Readers(KviCsCfgContainer *container)
    {
        for (const char *key : {"key1000", "key1199"})
            threads_.emplace_back([this, container, key] { read(container, key); });
    }
    ~Readers() { stop(); }
    void stop()
    {
        stop_ = true;
        for (auto &t : threads_)
            if (t.joinable())
                t.join();
    }
    int seenA() const { return seenA_; }
    int seenB() const { return seenB_; }
    int bad() const { return bad_; }

  private:
    void read(KviCsCfgContainer *container, const char *key)
    {
        const std::string a = std::string("A") + (key + 3);
        const std::string b = std::string("B") + (key + 3);
        while (!stop_) {
            char value[16];
            SaErrorT rc = kviCsCfgDataGet(key, sizeof value, value, container);
            if (rc == SA_OK && value == a)
                ++seenA_;
            else if (rc == SA_OK && value == b)
                ++seenB_;
            else
                ++bad_;
        }
    }
    std::atomic<bool> stop_{false};
    std::atomic<int> seenA_{0}, seenB_{0}, bad_{0};
    std::vector<std::thread> threads_;
};

void rewrite(const KviTempDir &dir, char tag, long shift)
{
    // Written aside and renamed, so a load never meets a half-written file.
    std::string aside = dir.write("next.conf", generation(tag));
    struct timeval times[2] = {{1000000000L + shift, 0}, {1000000000L + shift, 0}};
    ASSERT_EQ(utimes(aside.c_str(), times), 0);
    ASSERT_EQ(rename(aside.c_str(), dir.file("kvi.conf").c_str()), 0);
}

// Finalization refuses a container whose callbacks are running at that very
// moment (a watcher that reloads every second), and the caller tries again.
SaErrorT finalizeWhenIdle(KviCsCfgContainer *container)
{
    SaErrorT rc = SA_OK;
    for (int attempt = 0; attempt < 50; ++attempt) {
        rc = kviCsConfigFinalizeStrucure(container);
        if (rc != SA_ERR_HPI_INVALID_REQUEST)
            break;
        std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    return rc;
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
        EXPECT_EQ(readers.bad(), 0);
        EXPECT_GT(readers.seenA(), 0);
        EXPECT_GT(readers.seenB(), 0);
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
        rewrite(dir, 'B', 0);
        auto deadline = std::chrono::steady_clock::now() + 5s;
        while (reloads < 1 && std::chrono::steady_clock::now() < deadline)
            std::this_thread::sleep_for(20ms);
        rewrite(dir, 'A', 1);
        int before = reloads;
        while (reloads <= before && std::chrono::steady_clock::now() < deadline)
            std::this_thread::sleep_for(20ms);
        readers.stop();
        EXPECT_GE(reloads.load(), 2);
        EXPECT_EQ(readers.bad(), 0);
        EXPECT_GT(readers.seenA(), 0);
    }
    EXPECT_EQ(kviCsConfigUnregister(countReload, &cont), SA_OK);
    EXPECT_EQ(finalizeWhenIdle(&cont), SA_OK);
}
} // namespace
