#include <string>

#include "core/SaHpi/rpt/RptTestSupport.h"

namespace
{
// Runs first: nothing works before the store is set up, and it is set up once.
TEST(RdrInitTest, RefusesEverythingUntilInitializedOnce)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    SaHpiRdrT rdr = makeRdr(SAHPI_SENSOR_RDR);
    SaHpiBoolT active = SAHPI_FALSE;
    SaHpiEirIdT eir = 0;
    SaHpiUint32T size = 0;
    addRdr(1, SAHPI_SENSOR_RDR, {}, nullptr, SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(kviCsRdrGet(0, 1, SAHPI_NO_RECORD, SAHPI_FIRST_ENTRY, nullptr, &rdr, &active, nullptr,
                          nullptr, nullptr, nullptr),
              SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_EQ(kviCsDefaultEirGet(0, 1, &eir), SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Rdr not yet initialized"));
    EXPECT_NE(kviCsRdrHashSizeGet(&size), SA_OK);
    EXPECT_NE(kviCsRdrHashSizeSet(4), SA_OK);
    EXPECT_TRUE(log.contains("The RDR GlobalHashSizeSemaphore has not been initialized. "));

    // A resource needs its repository, which needs the store.
    ASSERT_EQ(kviCsDomainInitialize(), SA_OK);
    KviDsRptFnTable rptTable{};
    SaHpiResourceIdT id = 0;
    EXPECT_EQ(kviCsRptEntryAdd(0, makeRptEntry(), nullptr, SAHPI_FALSE, &rptTable, kTestMapl,
                               testLock(), &id),
              SA_ERR_HPI_ERROR);
    EXPECT_TRUE(log.contains("Unable to retrieve hash size, failing"));

    ASSERT_EQ(kviCsRdrInitialize(), SA_OK);
    EXPECT_EQ(kviCsRdrInitialize(), SA_ERR_HPI_DUPLICATE);
    EXPECT_TRUE(log.contains("kviCsRdrIniitalize called multiple times"));
    ASSERT_EQ(kviCsRdrHashSizeGet(&size), SA_OK);
    EXPECT_EQ(size, static_cast<SaHpiUint32T>(KVI_CS_DEFAULT_RDR_HASH_SIZE));
}

// Records go to one resource the fixture adds inactive with every kind of
// record among its capabilities.
class RdrTest : public ResourceModelTest
{
  protected:
    void SetUp() override
    {
        ResourceModelTest::SetUp();
        rid_ = addResource(SAHPI_FALSE);
    }
    SaHpiResourceIdT rid_ = 0;

    SaHpiUint32T nextRecordId()
    {
        SaHpiUint32T next = 0;
        withRepository(rid_,
                       [&](KviCsRdrRepositoryContainerT *repo) { next = repo->NextRecordId; });
        return next;
    }

    SaErrorT get(SaHpiRdrTypeT Type, SaHpiEntryIdT EntryId, SaHpiRdrT *Rdr = nullptr,
                 SaHpiEntryIdT *Next = nullptr, SaHpiBoolT *Active = nullptr)
    {
        SaHpiBoolT active = SAHPI_FALSE;
        return kviCsRdrGet(0, rid_, Type, EntryId, Next, Rdr, Active != nullptr ? Active : &active,
                           nullptr, nullptr, nullptr, nullptr);
    }

    // The record ids a client walking the resource's records sees.
    Ids walk()
    {
        Ids ids;
        for (SaHpiEntryIdT next = SAHPI_FIRST_ENTRY; next != SAHPI_LAST_ENTRY;) {
            SaHpiRdrT rdr{};
            if (get(SAHPI_NO_RECORD, next, &rdr, &next) != SA_OK)
                break;
            ids.push_back(rdr.RecordId);
        }
        return ids;
    }
};

// The number field of every kind sits first in the record's union, and the
// kinds share the number union, so one field each shows them all.
TEST_F(RdrTest, NumberIsTheLowByteOfTheRecordIdWhateverThePluginSet)
{
    for (SaHpiRdrTypeT type :
         {SAHPI_CTRL_RDR, SAHPI_SENSOR_RDR, SAHPI_INVENTORY_RDR, SAHPI_WATCHDOG_RDR}) {
        SCOPED_TRACE(type);
        SaHpiRdrT rdr = makeRdr(type);
        rdr.RecordId = 77;
        rdr.RdrTypeUnion.CtrlRec.Num = 77;
        KviCsRdrRecordNumT number{};
        number.SensorNum = 77;
        SaHpiEntryIdT recordId = addRdr(rid_, type, {}, nullptr, SA_OK, &rdr, &number);
        EXPECT_EQ(recordId, SaHpiEntryIdT(type));
        EXPECT_EQ(rdr.RecordId, recordId);
        EXPECT_EQ(rdr.RdrTypeUnion.CtrlRec.Num, SaHpiUint8T(type));
        EXPECT_EQ(number.ControlNum, SaHpiUint8T(type));
        SaHpiRdrT stored{};
        ASSERT_EQ(get(type, recordId, &stored), SA_OK);
        EXPECT_EQ(stored.RecordId, recordId);
        EXPECT_EQ(stored.RdrTypeUnion.CtrlRec.Num, SaHpiUint8T(type));
    }
    for (SaHpiEntryIdT id = 5; id < 256; id++)
        addRdr(rid_, SAHPI_SENSOR_RDR);
    SaHpiRdrT rdr = makeRdr(SAHPI_SENSOR_RDR);
    KviCsRdrRecordNumT number{};
    EXPECT_EQ(addRdr(rid_, SAHPI_SENSOR_RDR, {}, nullptr, SA_OK, &rdr, &number), 256u);
    EXPECT_EQ(number.SensorNum, 0);
    EXPECT_EQ(rdr.RdrTypeUnion.SensorRec.Num, 0);
}

TEST_F(RdrTest, WalkGoesByListThenAgeAndIgnoresTypes)
{
    for (SaHpiRdrTypeT type : {SAHPI_CTRL_RDR, SAHPI_SENSOR_RDR, SAHPI_INVENTORY_RDR,
                               SAHPI_WATCHDOG_RDR, SAHPI_SENSOR_RDR})
        addRdr(rid_, type);
    EXPECT_EQ(walk(), (Ids{3, 1, 4, 2, 5}));
    // A typed read names the next record of any type.
    SaHpiEntryIdT next = 0;
    SaHpiBoolT active = SAHPI_TRUE;
    ASSERT_EQ(get(SAHPI_SENSOR_RDR, 2, nullptr, &next, &active), SA_OK);
    EXPECT_EQ(next, 5u);
    EXPECT_FALSE(active) << "records carry their resource's state";
    ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(0, rid_, SAHPI_TRUE), SA_OK);
    ASSERT_EQ(get(SAHPI_SENSOR_RDR, 5, nullptr, &next, &active), SA_OK);
    EXPECT_EQ(next, SAHPI_LAST_ENTRY);
    EXPECT_TRUE(active);
}

// An active resource takes no records and spends no id; a record of a type
// that cannot be added spends its id all the same.
TEST_F(RdrTest, RefusedAddsLeaveTheRepositoryAlone)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    for (int type : {int(SAHPI_NO_RECORD), 9}) {
        SaHpiRdrT rdr{};
        storeRaw(rdr.RdrType, type);
        EXPECT_EQ(addRdr(rid_, SAHPI_NO_RECORD, {}, nullptr, SA_ERR_HPI_INVALID_PARAMS, &rdr), 0u);
        EXPECT_EQ(rdr.RecordId, 0u);
        EXPECT_TRUE(log.contains("RdrType is invalid (" + std::to_string(type) + ")"));
    }
    EXPECT_EQ(addRdr(rid_, SAHPI_CTRL_RDR), 3u);

    ASSERT_EQ(kviCsRptEntryActiveStateSetByRid(0, rid_, SAHPI_TRUE), SA_OK);
    addRdr(rid_, SAHPI_SENSOR_RDR, {}, nullptr, SA_ERR_HPI_INVALID_REQUEST);
    EXPECT_TRUE(log.contains("Can't add entries to active resources"));
    EXPECT_EQ(nextRecordId(), 4u);
    EXPECT_EQ(walk(), (Ids{3}));
}

TEST_F(RdrTest, LookupsCheckTheResourcesCapabilitiesThenTheRecordsType)
{
    addRdr(rid_, SAHPI_SENSOR_RDR);
    addRdr(rid_, SAHPI_CTRL_RDR);
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(get(SAHPI_SENSOR_RDR, 2), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("RDR entry type (1) does not match requested type (2)"));
    EXPECT_TRUE(log.contains("Rdr entry is not the correct type"));
    EXPECT_EQ(get(SAHPI_NO_RECORD, 2), SA_OK);
    EXPECT_EQ(get(SAHPI_CTRL_RDR, 9), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(get(static_cast<SaHpiRdrTypeT>(7), 1), SA_ERR_HPI_INVALID_CMD);
    EXPECT_TRUE(log.contains("Unknown RDR type (7)"));

    // A resource without any record capability is asked for none of them.
    rid_ = addResource(SAHPI_TRUE, kTestMapl, {}, nullptr, testLock(),
                       makeRptEntry(SAHPI_CAPABILITY_RESOURCE));
    SaHpiBoolT a = SAHPI_FALSE;
    for (SaErrorT rc :
         {kviCsRdrGetWatchdog(0, rid_, 1, nullptr, &a, nullptr, nullptr, nullptr, nullptr),
          kviCsRdrGetSensor(0, rid_, 1, nullptr, &a, nullptr, nullptr, nullptr, nullptr),
          kviCsRdrGetControl(0, rid_, 1, nullptr, &a, nullptr, nullptr, nullptr, nullptr),
          kviCsRdrGetEir(0, rid_, 1, nullptr, &a, nullptr, nullptr, nullptr, nullptr)})
        EXPECT_EQ(rc, SA_ERR_HPI_INVALID_CMD);
    for (const char *line :
         {"Resource does not support watchdogs", "Resource does not support sensors",
          "Resource does not support controls", "Resource does not support entity inventory"})
        EXPECT_TRUE(log.contains(line)) << line;
    EXPECT_EQ(get(SAHPI_NO_RECORD, SAHPI_FIRST_ENTRY), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_TRUE(log.contains("No Entries found."));
}

TEST_F(RdrTest, UnknownResourcesDomainsAndNullArgumentsAreRefusedWithoutSpendingAnId)
{
    SaHpiRdrT rdr = makeRdr(SAHPI_SENSOR_RDR);
    KviDsRdrFnTable table{};
    SaHpiEntryIdT id = 0;
    KviCsRdrRecordNumT num{};
    SaHpiBoolT active = SAHPI_FALSE;
    SaHpiEirIdT eir = 0;
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    const struct {
        SaErrorT rc, expected;
        const char *line;
    } cases[] = {
        {kviCsRdrAdd(0, 99, &rdr, nullptr, &table, &id, &num), SA_ERR_HPI_NOT_PRESENT,
         "kviCsRptGetRptEntryContainer failed, returned -1013"},
        {kviCsRdrAdd(2, rid_, &rdr, nullptr, &table, &id, &num), SA_ERR_HPI_INVALID_DOMAIN,
         "Invalid Domain"},
        {kviCsRdrGet(0, 99, SAHPI_NO_RECORD, 1, nullptr, &rdr, &active, nullptr, nullptr, nullptr,
                     nullptr),
         SA_ERR_HPI_INVALID_RESOURCE, "kviCsRptGetRptEntryContainer didn't return container"},
        {kviCsDefaultEirSet(0, 99, 1), SA_ERR_HPI_INVALID_RESOURCE, ""},
        {kviCsDefaultWatchdogGet(0, 99, &eir), SA_ERR_HPI_INVALID_RESOURCE, ""},
        {get(SAHPI_NO_RECORD, 1, &rdr), SA_ERR_HPI_NOT_PRESENT, ""},
        {kviCsRdrAdd(0, rid_, &rdr, nullptr, nullptr, &id, &num), SA_ERR_HPI_INVALID_PARAMS,
         "FnTable pointer is NULL."},
        {kviCsRdrAdd(0, rid_, &rdr, nullptr, &table, nullptr, &num), SA_ERR_HPI_INVALID_PARAMS,
         "RecordId pointer is NULL."},
        {kviCsRdrAdd(0, rid_, &rdr, nullptr, &table, &id, nullptr), SA_ERR_HPI_INVALID_PARAMS,
         "RecordNum pointer is NULL."},
        {kviCsRdrAdd(0, rid_, nullptr, nullptr, &table, &id, &num), SA_ERR_HPI_INVALID_PARAMS,
         "RdrEntry pointer is NULL."},
        {kviCsRdrGet(0, rid_, SAHPI_NO_RECORD, 1, nullptr, &rdr, nullptr, nullptr, nullptr, nullptr,
                     nullptr),
         SA_ERR_HPI_INVALID_PARAMS, "Active pointer is NULL."},
        {kviCsDefaultEirGet(0, rid_, nullptr), SA_ERR_HPI_INVALID_PARAMS, "EirId pointer is NULL."},
    };
    for (const auto &c : cases) {
        EXPECT_EQ(c.rc, c.expected) << c.line;
        EXPECT_TRUE(log.contains(c.line)) << c.line;
    }
    EXPECT_EQ(nextRecordId(), 1u);
}

TEST_F(RdrTest, NumberZeroOfInventoryAndWatchdogNamesTheDefault)
{
    for (SaHpiRdrTypeT type : {SAHPI_CTRL_RDR, SAHPI_INVENTORY_RDR, SAHPI_WATCHDOG_RDR,
                               SAHPI_INVENTORY_RDR, SAHPI_WATCHDOG_RDR})
        addRdr(rid_, type);
    SaHpiEirIdT eir = 9;
    SaHpiWatchdogNumT watchdog = 9;
    ASSERT_EQ(kviCsDefaultEirGet(0, rid_, &eir), SA_OK);
    ASSERT_EQ(kviCsDefaultWatchdogGet(0, rid_, &watchdog), SA_OK);
    EXPECT_EQ(eir, 0);
    EXPECT_EQ(watchdog, 0);

    ASSERT_EQ(kviCsDefaultEirSet(0, rid_, 4), SA_OK);
    ASSERT_EQ(kviCsDefaultWatchdogSet(0, rid_, 5), SA_OK);
    // Wrong kind or no such record: the default stays as it was.
    EXPECT_EQ(kviCsDefaultEirSet(0, rid_, 3), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsDefaultWatchdogSet(0, rid_, 2), SA_ERR_HPI_NOT_PRESENT);
    EXPECT_EQ(kviCsDefaultEirSet(0, rid_, 9), SA_ERR_HPI_NOT_PRESENT);

    SaHpiRdrT eir0{}, watchdog0{}, eir2{};
    SaHpiBoolT a = SAHPI_FALSE;
    ASSERT_EQ(kviCsRdrGetEir(0, rid_, SAHPI_DEFAULT_INVENTORY_ID, &eir0, &a, nullptr, nullptr,
                             nullptr, nullptr),
              SA_OK);
    ASSERT_EQ(kviCsRdrGetWatchdog(0, rid_, SAHPI_DEFAULT_WATCHDOG_NUM, &watchdog0, &a, nullptr,
                                  nullptr, nullptr, nullptr),
              SA_OK);
    ASSERT_EQ(kviCsRdrGetEir(0, rid_, 2, &eir2, &a, nullptr, nullptr, nullptr, nullptr), SA_OK);
    EXPECT_EQ(eir0.RecordId, 4u);
    EXPECT_EQ(watchdog0.RecordId, 5u);
    EXPECT_EQ(eir2.RecordId, 2u);
}

TEST_F(RdrTest, HashSizeAppliesToRepositoriesMadeAfterIt)
{
    KviLogCapture log(KVI_LOG_DBG_L_NUM);
    EXPECT_EQ(kviCsRdrHashSizeSet(0), SA_ERR_HPI_INVALID_PARAMS);
    EXPECT_TRUE(log.contains("Hash size can't be set to 0!"));
    EXPECT_EQ(kviCsRdrHashSizeGet(nullptr), SA_ERR_HPI_INVALID_PARAMS);

    ASSERT_EQ(kviCsRdrHashSizeSet(7), SA_OK);
    SaHpiResourceIdT old = rid_;
    rid_ = addResource(SAHPI_FALSE);
    ASSERT_EQ(kviCsRdrHashSizeSet(KVI_CS_DEFAULT_RDR_HASH_SIZE), SA_OK);
    withRepository(old, [](KviCsRdrRepositoryContainerT *repo) { EXPECT_EQ(repo->HashSize, 3u); });
    withRepository(rid_, [](KviCsRdrRepositoryContainerT *repo) { EXPECT_EQ(repo->HashSize, 7u); });
    for (int i = 0; i < 8; i++)
        addRdr(rid_, SAHPI_SENSOR_RDR);
    EXPECT_EQ(walk(), (Ids{7, 1, 8, 2, 3, 4, 5, 6}));
}

TEST_F(RdrTest, FailedAllocationsLeaveTheRepositoryAsItWasAndSpendTheId)
{
    addRdr(rid_, SAHPI_SENSOR_RDR);
    // The record's list node, then its container.
    const std::pair<SaHpiInt32T, const char *> cases[] = {
        {1, "kviCsLinkedListNodeMalloc failed, Out of Space"}, {2, "Malloc failed"}};
    for (auto [failing, line] : cases) {
        SCOPED_TRACE(failing);
        SaHpiInt32T blocks = liveBlocks();
        KviLogCapture log(KVI_LOG_DBG_L_NUM);
        kviCsMemoryFailNthAllocation(failing);
        addRdr(rid_, SAHPI_CTRL_RDR, {}, nullptr, SA_ERR_HPI_OUT_OF_SPACE);
        kviCsMemoryFailNthAllocation(0);
        EXPECT_TRUE(log.contains(line));
        EXPECT_EQ(liveBlocks(), blocks);
        EXPECT_EQ(walk(), (Ids{1}));
    }
    EXPECT_EQ(addRdr(rid_, SAHPI_SENSOR_RDR), 4u);
}

TEST_F(RdrTest, RecordIdsRollingOverEndsTheProcess)
{
    withRepository(rid_,
                   [](KviCsRdrRepositoryContainerT *repo) { repo->NextRecordId = 0xFFFFFFFE; });
    EXPECT_EQ(addRdr(rid_, SAHPI_SENSOR_RDR), 0xFFFFFFFEu);
    expectFatalExit([this] { addRdr(rid_, SAHPI_SENSOR_RDR); },
                    "Record Id's have rolled over (more than 2^32 generated). Record Id's are no "
                    "longer unique.  This is bad. ");
}

} // namespace
