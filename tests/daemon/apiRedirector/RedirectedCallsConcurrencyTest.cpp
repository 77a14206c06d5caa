// Clients calling the redirected calls while the plug-in set changes under
// them through the configuration file: the simulator is unloaded and loaded
// again by the configuration watcher. No call may deadlock, race or answer
// with a code that the front end does not give.
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <random>
#include <set>
#include <thread>
#include <vector>

#include "../../plugins/simulator/SimulatorTestSupport.h"
#include "../maplManager/KviTestMapls.h"
#include "support/KviTestSupport.h"

namespace
{

// What a call may answer while its resource comes and goes: done, gone
// (resource or record no longer there), a lock that did not come in time, a
// slot the record lacks, or a plug-in's own refusal of what the walk found.
const std::set<SaErrorT> ALLOWED = {SA_OK,
                                    SA_ERR_HPI_INVALID_RESOURCE,
                                    SA_ERR_HPI_NOT_PRESENT,
                                    SA_ERR_HPI_NO_RESPONSE,
                                    SA_ERR_HPI_INVALID_CMD,
                                    SA_ERR_HPI_DATA_LEN_INVALID,
                                    SA_ERR_HPI_INVALID_PARAMS,
                                    SA_ERR_HPI_INVALID_DATA};

// One call on a random record of a random resource, found the way a client
// finds it.
SaErrorT randomCall(SaHpiSessionIdT Session, std::mt19937 &Random)
{
    SaHpiRptEntryT entry{};
    SaHpiEntryIdT at = SAHPI_FIRST_ENTRY;
    for (unsigned skip = Random() % 8; skip-- > 0 && at != SAHPI_LAST_ENTRY;) {
        const SaErrorT rc = saHpiRptEntryGet(Session, at, &at, &entry);
        if (rc != SA_OK)
            return rc;
    }
    if (entry.ResourceId == 0)
        return saHpiResourcesDiscover(Session);
    const SaHpiResourceIdT rid = entry.ResourceId;
    SaHpiRdrT rdr{};
    SaHpiEntryIdT next = 0;
    SaErrorT rc = saHpiRdrGet(Session, rid, SAHPI_FIRST_ENTRY, &next, &rdr);
    if (rc != SA_OK)
        return rc;
    switch (rdr.RdrType) {
    case SAHPI_SENSOR_RDR: {
        SaHpiSensorReadingT reading{};
        return saHpiSensorReadingGet(Session, rid, rdr.RdrTypeUnion.SensorRec.Num, &reading);
    }
    case SAHPI_CTRL_RDR: {
        SaHpiCtrlStateT state{};
        state.StateUnion.Text.Line = 1;
        rc = saHpiControlStateGet(Session, rid, rdr.RdrTypeUnion.CtrlRec.Num, &state);
        return rc != SA_OK
                   ? rc
                   : saHpiControlStateSet(Session, rid, rdr.RdrTypeUnion.CtrlRec.Num, &state);
    }
    default: {
        SaHpiSelInfoT info{};
        SaHpiTimeT time = 0;
        rc = saHpiEventLogInfoGet(Session, rid, &info);
        return rc != SA_OK ? rc : saHpiEventLogTimeGet(Session, rid, &time);
    }
    }
}

bool simulatorLoaded(SaHpiSessionIdT Session)
{
    saHpiResourcesDiscover(Session);
    for (SaHpiEntryIdT at = SAHPI_FIRST_ENTRY; at != SAHPI_LAST_ENTRY;) {
        SaHpiRptEntryT entry{};
        if (saHpiRptEntryGet(Session, at, &at, &entry) != SA_OK)
            return false;
        if (textOf(entry.ResourceTag).rfind("Chassis", 0) == 0)
            return true;
    }
    return false;
}

TEST(RedirectedCallsConcurrencyTest, ClientsCallWhileThePluginSetIsReloaded)
{
    KviTempDir dir;
    const std::string rest =
        "KviNvStorageDir = \"" + dir.file("nv") + "\"\nKviSimProcessorBoards = \"2\"\n";
    const std::string withSimulator = "mapl_modules = \"" + simulatorPath() + "\"\n" + rest;
    const std::string without = kviTestMaplConfig(kviTestMaplList({"KviTestMaplGoodA"}), rest);
    const std::string config = dir.write("kvi.conf", withSimulator);
    ASSERT_EQ(kviCsConfigInit(SAHPI_TRUE, config.c_str()), SA_OK);
    ASSERT_EQ(kviDsApiRedirectorInitialize(), SA_OK);
    SaHpiVersionT version = 0;
    ASSERT_EQ(saHpiInitialize(&version), SA_OK);
    SaHpiSessionIdT session = 0;
    ASSERT_EQ(saHpiSessionOpen(SAHPI_DEFAULT_DOMAIN_ID, &session, nullptr), SA_OK);
    ASSERT_TRUE(simulatorLoaded(session));

    std::atomic<bool> stop{false};
    std::atomic<int> calls{0};
    std::vector<std::thread> clients;
    for (unsigned i = 0; i < 4; i++)
        clients.emplace_back([&, i] {
            std::mt19937 random(i + 1);
            while (!stop) {
                const SaErrorT rc = randomCall(session, random);
                EXPECT_TRUE(ALLOWED.count(rc)) << "unexpected " << rc;
                calls++;
            }
        });
    // The watcher notices each rewrite within a few seconds; the test waits
    // for the shelf to go and to come back.
    for (const std::string *text : {&without, &withSimulator}) {
        std::this_thread::sleep_for(std::chrono::milliseconds(1100));
        dir.write("kvi.conf", *text);
        const bool wanted = text == &withSimulator;
        const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(20);
        while (simulatorLoaded(session) != wanted && std::chrono::steady_clock::now() < limit)
            std::this_thread::sleep_for(std::chrono::milliseconds(50));
        EXPECT_EQ(simulatorLoaded(session), wanted);
    }
    stop = true;
    for (std::thread &t : clients)
        t.join();
    EXPECT_GT(calls.load(), 0);
    EXPECT_EQ(saHpiFinalize(), SA_OK);
    EXPECT_EQ(kviCsConfigFinalize(), SA_OK); // stops the watcher
}

} // namespace
