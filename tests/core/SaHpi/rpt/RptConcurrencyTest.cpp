#include <algorithm>
#include <atomic>
#include <set>
#include <thread>
#include <vector>

#include <gtest/gtest.h>

#include "core/SaHpi/rpt/RptTestSupport.h"

namespace
{
template <typename Body> void runThreads(int Count, Body body)
{
    std::vector<std::thread> threads;
    for (int i = 0; i < Count; i++)
        threads.emplace_back(body, i);
    for (std::thread &t : threads)
        t.join();
}

std::atomic<int> cleanups{0};

SaErrorT countCleanup(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *, void *, KviDsRdrFnTable *)
{
    cleanups++;
    return SA_OK;
}

class RptConcurrencyTest : public ResourceModelTest
{
};

// Plug-in threads add resources with records, make them active, read them
// back and remove them, while a client thread keeps walking the table.
TEST_F(RptConcurrencyTest, AddGetRemoveFromManyThreads)
{
    constexpr int writers = 6;
    constexpr int rounds = 60;
    constexpr int recordsEach = 3;
    cleanups = 0;
    SaHpiUint32T countBefore = updateCount();
    std::atomic<bool> writing{true};
    std::atomic<int> failures{0};
    std::vector<std::vector<SaHpiResourceIdT>> ids(writers);
    auto expect = [&](bool ok) {
        if (!ok)
            failures++;
    };

    std::thread client([&] {
        while (writing) {
            std::vector<SaHpiEntryIdT> seen = walkRpt();
            std::set<SaHpiEntryIdT> unique(seen.begin(), seen.end());
            expect(unique.size() == seen.size());
        }
    });
    runThreads(writers, [&](int w) {
        KviDsRdrFnTable table{};
        table.RdrResourcesRemove = countCleanup;
        for (int r = 0; r < rounds; r++) {
            SaHpiResourceIdT id = addResource(SAHPI_FALSE, kTestMapl);
            expect(id != 0);
            ids[w].push_back(id);
            for (int k = 0; k < recordsEach; k++)
                expect(addRdr(id, SAHPI_SENSOR_RDR, table) == SaHpiEntryIdT(k + 1));
            expect(kviCsRptEntryActiveStateSetByRid(0, id, SAHPI_TRUE) == SA_OK);
            SaHpiRptEntryT entry{};
            SaHpiUint32T mapl = 0;
            expect(kviCsRptActiveEntryGetByRid(0, id, &entry, nullptr, nullptr, &mapl, nullptr) ==
                   SA_OK);
            expect(entry.ResourceId == id && mapl == kTestMapl);
            SaHpiBoolT active = SAHPI_FALSE;
            expect(kviCsRdrGetSensor(0, id, 2, nullptr, &active, nullptr, nullptr, nullptr,
                                     nullptr) == SA_OK);
            expect(kviCsRptEntryModifySeverityByRid(0, id, SAHPI_MAJOR) == SA_OK);
            expect(kviCsRptEntryRemoveByRid(0, id) == SA_OK);
        }
    });
    writing = false;
    client.join();

    EXPECT_EQ(failures, 0);
    std::vector<SaHpiResourceIdT> all;
    for (auto &mine : ids)
        all.insert(all.end(), mine.begin(), mine.end());
    std::set<SaHpiResourceIdT> unique(all.begin(), all.end());
    EXPECT_EQ(unique.size(), all.size()) << "no id handed out twice";
    EXPECT_EQ(*unique.rbegin(), SaHpiResourceIdT(writers * rounds));
    EXPECT_EQ(cleanups, writers * rounds * recordsEach);
    // add, activate, severity, remove: four changes per round.
    EXPECT_EQ(updateCount() - countBefore, SaHpiUint32T(writers * rounds * 4));
}

// One plug-in unloads while others keep adding: its entries all go, theirs
// all stay.
TEST_F(RptConcurrencyTest, RemovingOnePluginWhileOthersAdd)
{
    constexpr int perPlugin = 80;
    for (int i = 0; i < perPlugin; i++)
        addResource(SAHPI_TRUE, kOtherMapl, KviDsRptFnTable{}, nullptr, otherLock());
    std::atomic<int> added{0};
    std::thread unloader([] { EXPECT_EQ(kviCsRptEntrysRemoveByLock(0, otherLock()), SA_OK); });
    runThreads(3, [&](int) {
        for (int i = 0; i < perPlugin / 2; i++)
            if (addResource(SAHPI_TRUE) != 0)
                added++;
    });
    unloader.join();
    std::vector<SaHpiEntryIdT> left = walkRpt();
    EXPECT_EQ(int(left.size()), added.load());
    for (SaHpiEntryIdT id : left) {
        SaHpiUint32T mapl = 0;
        ASSERT_EQ(kviCsRptActiveEntryGetByRid(0, id, nullptr, nullptr, nullptr, &mapl, nullptr),
                  SA_OK);
        EXPECT_EQ(mapl, kTestMapl);
    }
}

} // namespace
