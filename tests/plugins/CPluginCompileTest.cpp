#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <string>

#include <gtest/gtest.h>

#include "core/SaHpi/rpt/RptTestSupport.h"
#include "support/KviTestSupport.h"

namespace
{
// The tables are arrays of function pointers in the contract's slot order, on
// 32-bit and 64-bit builds alike.
using Slot = void (*)();
static_assert(sizeof(KviMaplInitTableT) == 4 * sizeof(Slot));
static_assert(sizeof(KviDsRptFnTable) == 26 * sizeof(Slot));
static_assert(sizeof(KviDsRdrFnTable) == 18 * sizeof(Slot));
static_assert(offsetof(KviMaplInitTableT, ResourcesDiscover) == 3 * sizeof(Slot));
static_assert(offsetof(KviDsRptFnTable, ResourcePowerStateGet) == 16 * sizeof(Slot));
static_assert(offsetof(KviDsRptFnTable, RptEntryResourcesRemove) == 22 * sizeof(Slot));
static_assert(offsetof(KviDsRptFnTable, RptRestoreParmControl) == 25 * sizeof(Slot));
static_assert(offsetof(KviDsRdrFnTable, EntityInventoryDataWrite) == 12 * sizeof(Slot));
static_assert(offsetof(KviDsRdrFnTable, RdrResourcesRemove) == 14 * sizeof(Slot));
static_assert(offsetof(KviDsRdrFnTable, RdrRestoreParmControl) == 17 * sizeof(Slot));
static_assert(KVI_MAPL_INTR_VERSION == 0x101);

template <typename Table> int filledSlots(const Table &table)
{
    int filled = 0;
    for (size_t at = 0; at < sizeof table; at += sizeof(Slot)) {
        Slot slot;
        memcpy(&slot, reinterpret_cast<const char *>(&table) + at, sizeof slot);
        filled += slot != nullptr;
    }
    return filled;
}

std::string pluginPath()
{
    const char *dir = getenv("KVI_TEST_BINARY_DIR");
    return std::string(dir != nullptr ? dir : ".") + "/plugins/libCPluginCompile.so";
}

// The plug-in goes through the real loader and the plug-in manager, and
// registers through the C interface alone.
TEST(CPluginCompileTest, RegistersAResourceWithRecordsThroughTheCInterface)
{
    initResourceModel();
    KviTempDir dir;
    std::string config = dir.write("kvi.conf", "mapl_modules = \"" + pluginPath() + "\"\n");
    ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, config.c_str()), SA_OK);
    ASSERT_EQ(kviDsMaplManagerInitialize(), SA_OK);
    SaHpiInt32T blocks = 0;
    kviCsGetMemorySegmentsAllocated(&blocks);
    ASSERT_EQ(kviDsMaplManagerLoadMapls(), SA_OK);
    ASSERT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);
    ASSERT_EQ(kviDsMaplManagerDiscoverResources(SAHPI_DEFAULT_DOMAIN_ID), SA_OK);

    SaHpiRptEntryT entry{};
    SaHpiEntryIdT next = 0;
    ASSERT_EQ(kviCsRptActiveEntryGet(0, SAHPI_FIRST_ENTRY, &next, &entry, nullptr), SA_OK);
    EXPECT_EQ(next, SAHPI_LAST_ENTRY) << "a second discovery adds nothing";
    EXPECT_EQ(
        std::string(reinterpret_cast<char *>(entry.ResourceTag.Data), entry.ResourceTag.DataLength),
        "C plug-in");
    KviDsRptFnTable rptTable{};
    SaHpiUint32T mapl = 99;
    KviCsRwLockT *lock = nullptr;
    KviCsRwLockT *lockZero = nullptr;
    ASSERT_EQ(
        kviCsRptActiveEntryGetByRid(0, entry.ResourceId, nullptr, &rptTable, nullptr, &mapl, &lock),
        SA_OK);
    ASSERT_EQ(kviDsMaplManagerUnprotectedGetMaplLock(mapl, 0, &lockZero), SA_OK);
    EXPECT_EQ(lock, lockZero);
    EXPECT_EQ(filledSlots(rptTable), 26);
    SaHpiHsPowerStateT power = SAHPI_HS_POWER_OFF;
    ASSERT_EQ(rptTable.ResourcePowerStateGet(0, entry.ResourceId, nullptr, &power), SA_OK);
    EXPECT_EQ(power, SAHPI_HS_POWER_ON);

    SaHpiRdrT rdr{};
    SaHpiBoolT active = SAHPI_FALSE;
    KviDsRdrFnTable rdrTable{};
    ASSERT_EQ(kviCsRdrGetEir(0, entry.ResourceId, SAHPI_DEFAULT_INVENTORY_ID, &rdr, &active,
                             nullptr, &rdrTable, nullptr, nullptr),
              SA_OK);
    EXPECT_EQ(rdr.RecordId, 3u) << "the plug-in made its inventory record the default";
    EXPECT_TRUE(active);
    EXPECT_EQ(filledSlots(rdrTable), 18);
    EXPECT_EQ(kviCsRdrGetWatchdog(0, entry.ResourceId, 4, &rdr, &active, nullptr, nullptr, nullptr,
                                  nullptr),
              SA_OK);

    // Unloading removes the resource; the library's default removal slots
    // give back the blocks the plug-in hung on it and its records.
    ASSERT_EQ(kviDsMaplManagerUnloadAllMapls(), SA_OK);
    EXPECT_TRUE(walkRpt().empty());
    SaHpiInt32T after = 0;
    kviCsGetMemorySegmentsAllocated(&after);
    EXPECT_EQ(after, blocks);
    kviCsConfigFinalize();
}

} // namespace
