// Fixtures shared by the tests of the resource model: the domain set up once
// per test program, resources added on behalf of pretend plug-ins, and the
// walk as a client sees it.
#pragma once

#include <cstring>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "KviDaemonCore.h"
#include "core/utils/Memory.h"
#include "support/KviTestSupport.h"

// Stores a number that is none of the enum's values, as a C caller can.
template <typename Enum> void storeRaw(Enum &Field, SaHpiInt32T Value)
{
    static_assert(sizeof(Enum) == sizeof(Value));
    memcpy(&Field, &Value, sizeof Value);
}

// Plug-in numbers the tests add resources for; each fixture removes their
// entries when it ends, so the table is empty between tests.
constexpr SaHpiUint32T kTestMapl = 7;
constexpr SaHpiUint32T kOtherMapl = 8;

// Only the address of a plug-in lock matters to the table.
inline KviCsRwLockT *testLock()
{
    static KviCsRwLockT lock;
    return &lock;
}
inline KviCsRwLockT *otherLock()
{
    static KviCsRwLockT lock;
    return &lock;
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

inline KviCsRptContainerT *rptContainer()
{
    KviCsRptContainerT *rpt = nullptr;
    EXPECT_EQ(kviCsGetRptContainerByDomainId(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    return rpt;
}

// Points the id generator at Next, as if that many ids had been handed out.
inline void setNextResourceId(SaHpiResourceIdT Next)
{
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    rpt->LastResourceId = Next;
    kviCsRptUnlockRpt(rpt);
}

inline SaHpiUint32T updateCount()
{
    SaHpiRptInfoT info{};
    EXPECT_EQ(kviCsRptInfoGet(SAHPI_DEFAULT_DOMAIN_ID, &info), SA_OK);
    return info.UpdateCount;
}

constexpr SaHpiCapabilitiesT kAllRdrCapabilities =
    SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_RDR | SAHPI_CAPABILITY_CONTROL |
    SAHPI_CAPABILITY_SENSOR | SAHPI_CAPABILITY_INVENTORY_DATA | SAHPI_CAPABILITY_WATCHDOG;

inline SaHpiRptEntryT makeRptEntry(SaHpiCapabilitiesT Capabilities = kAllRdrCapabilities)
{
    SaHpiRptEntryT entry{};
    entry.ResourceCapabilities = Capabilities;
    entry.ResourceSeverity = SAHPI_MINOR;
    entry.ResourceTag.DataType = SAHPI_TL_TYPE_LANGUAGE;
    entry.ResourceTag.Language = SAHPI_LANG_ENGLISH;
    return entry;
}

inline SaHpiResourceIdT addResource(SaHpiBoolT Active, SaHpiUint32T Mapl = kTestMapl,
                                    const KviDsRptFnTable &FnTable = KviDsRptFnTable{},
                                    void *UserDefined = nullptr, KviCsRwLockT *Lock = testLock(),
                                    SaHpiRptEntryT Entry = makeRptEntry())
{
    KviDsRptFnTable table = FnTable;
    SaHpiResourceIdT id = 0;
    EXPECT_EQ(kviCsRptEntryAdd(SAHPI_DEFAULT_DOMAIN_ID, Entry, UserDefined, Active, &table, Mapl,
                               Lock, &id),
              SA_OK);
    return id;
}

inline SaHpiRdrT makeRdr(SaHpiRdrTypeT Type)
{
    SaHpiRdrT rdr{};
    rdr.RdrType = Type;
    return rdr;
}

inline SaHpiEntryIdT addRdr(SaHpiResourceIdT ResourceId, SaHpiRdrTypeT Type,
                            const KviDsRdrFnTable &FnTable = KviDsRdrFnTable{},
                            void *UserDefined = nullptr)
{
    SaHpiRdrT rdr = makeRdr(Type);
    KviDsRdrFnTable table = FnTable;
    SaHpiEntryIdT recordId = 0;
    KviCsRdrRecordNumT number{};
    EXPECT_EQ(kviCsRdrAdd(SAHPI_DEFAULT_DOMAIN_ID, ResourceId, &rdr, UserDefined, &table, &recordId,
                          &number),
              SA_OK);
    return recordId;
}

// The entry ids a client walking the whole table sees, in order.
inline std::vector<SaHpiEntryIdT> walkRpt()
{
    std::vector<SaHpiEntryIdT> ids;
    SaHpiEntryIdT next = SAHPI_FIRST_ENTRY;
    while (next != SAHPI_LAST_ENTRY) {
        SaHpiRptEntryT entry{};
        SaHpiBoolT active = SAHPI_FALSE;
        if (kviCsRptEntryGet(SAHPI_DEFAULT_DOMAIN_ID, next, &next, &entry, &active, nullptr) !=
            SA_OK)
            break;
        ids.push_back(entry.ResourceId);
    }
    return ids;
}

// Runs Body with the resource's record repository, under the RPT lock.
template <typename Body> void withRepository(SaHpiResourceIdT ResourceId, Body body)
{
    KviCsRptContainerT *rpt = nullptr;
    ASSERT_EQ(kviCsRptLockRpt(SAHPI_DEFAULT_DOMAIN_ID, &rpt), SA_OK);
    KviCsRptEntryContainerT *entry = nullptr;
    EXPECT_EQ(kviCsRptGetRptEntryContainer(rpt, ResourceId, &entry), SA_OK);
    if (entry != nullptr)
        body(&entry->RdrRepositoryContainer);
    kviCsRptUnlockRpt(rpt);
}

// Runs Body in a child process that must end with exit status 1 after
// writing Line to its log. The child is forked from this very state (the
// table as the test built it), so the death test style is "fast".
template <typename Body> void expectFatalExit(Body body, const std::string &Line)
{
    GTEST_FLAG_SET(death_test_style, "fast");
    KviTempDir dir;
    std::string path = dir.file("fatal.log");
    EXPECT_EXIT(
        {
            kviCsLogClose();
            kviCsLogInitialize(KVI_LOG_DBG_L_NUM, path.c_str());
            body();
            exit(0);
        },
        testing::ExitedWithCode(1), "");
    std::ifstream in(path);
    std::string log((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    EXPECT_NE(log.find(Line), std::string::npos) << "missing: " << Line << "\nlog:\n" << log;
}

// Sets up the resource model once and empties the table after every test.
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
        EXPECT_EQ(kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, kTestMapl), SA_OK);
        EXPECT_EQ(kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, kOtherMapl), SA_OK);
        EXPECT_TRUE(walkRpt().empty());
        EXPECT_EQ(liveBlocks(), liveBlocks_) << "the table leaked or freed too much";
    }
    static SaHpiInt32T liveBlocks()
    {
        SaHpiInt32T n = 0;
        kviCsGetMemorySegmentsAllocated(&n);
        return n;
    }

  private:
    SaHpiInt32T liveBlocks_ = 0;
};
