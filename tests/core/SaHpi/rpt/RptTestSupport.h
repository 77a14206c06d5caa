// Fixtures shared by the tests of the resource model: the domain set up once
// per test program, resources added on behalf of pretend plug-ins, and the
// walk as a client sees it.
#pragma once

#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "KviDaemonCore.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

using Ids = std::vector<SaHpiEntryIdT>;

// Stores a number that is none of the enum's values, as a C caller can.
template <typename Enum> void storeRaw(Enum &Field, SaHpiInt32T Value)
{
    static_assert(sizeof(Enum) == sizeof(Value));
    memcpy(&Field, &Value, sizeof Value);
}

// Plug-in numbers and locks the tests add resources for (only a lock's
// address matters to the table); each fixture removes their entries when it
// ends, so the table is empty between tests.
constexpr SaHpiUint32T kTestMapl = 7;
constexpr SaHpiUint32T kOtherMapl = 8;
inline KviCsRwLockT kviTestPluginLocks[2];
inline KviCsRwLockT *testLock()
{
    return &kviTestPluginLocks[0];
}
inline KviCsRwLockT *otherLock()
{
    return &kviTestPluginLocks[1];
}

inline void initResourceModel()
{
    static bool done = [] {
        kviCsDomainInitialize();
        kviCsRptInitialize();
        kviCsRdrInitialize();
        return true;
    }();
    (void)done;
}

// Runs Body with the table held.
template <typename Body> void withRpt(Body body)
{
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(0, &rpt), SA_OK);
    body(rpt);
    kviCsRptUnlockRpt(rpt);
}

// Points the id generator at Next, as if that many ids had been handed out.
inline void setNextResourceId(SaHpiResourceIdT Next)
{
    withRpt([Next](KviCsRptContainerT *rpt) { rpt->LastResourceId = Next; });
}

inline SaHpiUint32T updateCount()
{
    SaHpiRptInfoT info{};
    EXPECT_EQ(kviCsRptInfoGet(0, &info), SA_OK);
    return info.UpdateCount;
}

inline SaHpiRptEntryT
makeRptEntry(SaHpiCapabilitiesT Capabilities = SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_RDR |
                                               SAHPI_CAPABILITY_CONTROL | SAHPI_CAPABILITY_SENSOR |
                                               SAHPI_CAPABILITY_INVENTORY_DATA |
                                               SAHPI_CAPABILITY_WATCHDOG)
{
    SaHpiRptEntryT entry{};
    entry.ResourceCapabilities = Capabilities;
    entry.ResourceSeverity = SAHPI_MINOR;
    entry.ResourceTag.DataType = SAHPI_TL_TYPE_LANGUAGE;
    entry.ResourceTag.Language = SAHPI_LANG_ENGLISH;
    return entry;
}

inline SaHpiResourceIdT addResource(SaHpiBoolT Active, SaHpiUint32T Mapl = kTestMapl,
                                    KviDsRptFnTable FnTable = {}, void *UserDefined = nullptr,
                                    KviCsRwLockT *Lock = testLock(),
                                    SaHpiRptEntryT Entry = makeRptEntry())
{
    SaHpiResourceIdT id = 0;
    EXPECT_EQ(kviCsRptEntryAdd(0, Entry, UserDefined, Active, &FnTable, Mapl, Lock, &id), SA_OK);
    return id;
}

inline SaHpiRdrT makeRdr(SaHpiRdrTypeT Type)
{
    SaHpiRdrT rdr{};
    rdr.RdrType = Type;
    return rdr;
}

// Adds a record; the expected result and the numbers handed out go through
// the optional arguments.
inline SaHpiEntryIdT addRdr(SaHpiResourceIdT ResourceId, SaHpiRdrTypeT Type,
                            KviDsRdrFnTable FnTable = {}, void *UserDefined = nullptr,
                            SaErrorT Expected = SA_OK, SaHpiRdrT *Rdr = nullptr,
                            KviCsRdrRecordNumT *Number = nullptr)
{
    SaHpiRdrT rdr = makeRdr(Type);
    KviCsRdrRecordNumT number{};
    SaHpiEntryIdT recordId = 0;
    EXPECT_EQ(kviCsRdrAdd(0, ResourceId, Rdr != nullptr ? Rdr : &rdr, UserDefined, &FnTable,
                          &recordId, Number != nullptr ? Number : &number),
              Expected);
    return recordId;
}

// The entry ids a client walking the whole table sees, in order.
inline Ids walkRpt()
{
    Ids ids;
    for (SaHpiEntryIdT next = SAHPI_FIRST_ENTRY; next != SAHPI_LAST_ENTRY;) {
        SaHpiRptEntryT entry{};
        SaHpiBoolT active = SAHPI_FALSE;
        if (kviCsRptEntryGet(0, next, &next, &entry, &active, nullptr) != SA_OK)
            break;
        ids.push_back(entry.ResourceId);
    }
    return ids;
}

// Runs Body with the resource's record repository, under the RPT lock.
template <typename Body> void withRepository(SaHpiResourceIdT ResourceId, Body body)
{
    withRpt([&](KviCsRptContainerT *rpt) {
        KviCsRptEntryContainerT *entry = nullptr;
        ASSERT_EQ(kviCsRptGetRptEntryContainer(rpt, ResourceId, &entry), SA_OK);
        body(&entry->RdrRepositoryContainer);
    });
}

// Runs Body in a child process that must end with exit status 1 after
// writing Line to its log. The child is forked from this very state (the
// table as the test built it), so the death test style is "fast".
template <typename Body> void expectFatalExit(Body body, const std::string &Line)
{
    GTEST_FLAG_SET(death_test_style, "fast");
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EXIT(
        {
            body();
            exit(0);
        },
        testing::ExitedWithCode(1), "");
    EXPECT_TRUE(log.contains(Line)) << Line;
}

// Sets up the resource model once and empties the table after every test,
// which must give back every block the test's entries took.
class ResourceModelTest : public testing::Test
{
  protected:
    void SetUp() override
    {
        initResourceModel();
        setNextResourceId(1);
        liveBlocks_ = liveBlocks();
    }
    void TearDown() override
    {
        kviCsMemoryFailNthAllocation(0);
        EXPECT_EQ(kviCsRptEntrysRemoveByMapl(0, kTestMapl), SA_OK);
        EXPECT_EQ(kviCsRptEntrysRemoveByMapl(0, kOtherMapl), SA_OK);
        EXPECT_TRUE(walkRpt().empty());
        EXPECT_EQ(liveBlocks(), liveBlocks_) << "the table leaked or freed too much";
    }
    static SaHpiInt32T liveBlocks() { return kviTestLiveBlocks(); }

  private:
    SaHpiInt32T liveBlocks_ = 0;
};
