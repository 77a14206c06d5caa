// A small fake plug-in for the parameter-control tests: resources with
// sensors and controls registered in the real RPT and RDR tables, whose
// slots keep their settings in plain structs and record every call, over a
// real object store in a temporary directory.
#pragma once

#include <cstdio>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "KviDaemonCore.h"
#include "support/KviTestSupport.h"

namespace pctest
{

// What a record's slots read and write, and how they are told to fail.
struct FakeRecord {
    SaHpiSensorThresholdsT Thresholds{};
    SaHpiSensorEvtEnablesT Enables{};
    SaHpiCtrlStateT Ctrl{};
    SaHpiCapabilitiesT CapabilitiesSeen = 0;
    SaHpiEventCategoryT CategorySeen = 0;
    SaHpiTxtLineNumT LineAsked = 0;
    SaErrorT GetResult = SA_OK;
    SaErrorT SetResult = SA_OK;
};

struct FakeResource {
    SaHpiBoolT EventLog = SAHPI_TRUE;
    SaErrorT GetResult = SA_OK;
    SaErrorT SetResult = SA_OK;
};

// Slot calls in order, as "Slot rid/num".
inline std::vector<std::string> calls;

inline void called(const char *Slot, SaHpiResourceIdT Rid, unsigned Num = 0)
{
    calls.push_back(std::string(Slot) + " " + std::to_string(Rid) + "/" + std::to_string(Num));
}

inline FakeRecord *rec(void *UserData)
{
    return static_cast<FakeRecord *>(UserData);
}

inline SaErrorT thresholdsGet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiSensorNumT Num,
                              SaHpiRdrT *, void *UserData, SaHpiSensorThresholdsT *T)
{
    called("ThresholdsGet", Rid, Num);
    *T = rec(UserData)->Thresholds;
    return rec(UserData)->GetResult;
}

inline SaErrorT thresholdsSet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiSensorNumT Num,
                              SaHpiRdrT *, SaHpiSensorThresholdsT *T, void *UserData)
{
    called("ThresholdsSet", Rid, Num);
    if (rec(UserData)->SetResult == SA_OK)
        rec(UserData)->Thresholds = *T;
    return rec(UserData)->SetResult;
}

inline SaErrorT enablesGet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiSensorNumT Num,
                           void *UserData, SaHpiCapabilitiesT Caps, SaHpiEventCategoryT Category,
                           SaHpiSensorEvtEnablesT *E)
{
    called("EnablesGet", Rid, Num);
    rec(UserData)->CapabilitiesSeen = Caps;
    rec(UserData)->CategorySeen = Category;
    *E = rec(UserData)->Enables;
    return rec(UserData)->GetResult;
}

inline SaErrorT enablesSet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiSensorNumT Num,
                           SaHpiSensorEvtEnablesT *E, SaHpiRdrT *, SaHpiCapabilitiesT Caps,
                           void *UserData)
{
    called("EnablesSet", Rid, Num);
    rec(UserData)->CapabilitiesSeen = Caps;
    if (rec(UserData)->SetResult == SA_OK)
        rec(UserData)->Enables = *E;
    return rec(UserData)->SetResult;
}

inline SaErrorT ctrlGet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiCtrlNumT Num, void *UserData,
                        SaHpiCtrlStateT *State)
{
    called("CtrlGet", Rid, Num);
    rec(UserData)->LineAsked = State->StateUnion.Text.Line;
    *State = rec(UserData)->Ctrl;
    return rec(UserData)->GetResult;
}

inline SaErrorT ctrlSet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiCtrlNumT Num,
                        SaHpiCtrlStateT *State, void *UserData)
{
    called("CtrlSet", Rid, Num);
    if (rec(UserData)->SetResult == SA_OK)
        rec(UserData)->Ctrl = *State;
    return rec(UserData)->SetResult;
}

inline SaErrorT evtLogGet(SaHpiDomainIdT, SaHpiResourceIdT Rid, void *UserDefined,
                          SaHpiBoolT *Enable)
{
    called("EvtLogGet", Rid);
    *Enable = static_cast<FakeResource *>(UserDefined)->EventLog;
    return static_cast<FakeResource *>(UserDefined)->GetResult;
}

inline SaErrorT evtLogSet(SaHpiDomainIdT, SaHpiResourceIdT Rid, SaHpiBoolT Enable,
                          void *UserDefined)
{
    called("EvtLogSet", Rid);
    auto *res = static_cast<FakeResource *>(UserDefined);
    if (res->SetResult == SA_OK)
        res->EventLog = Enable;
    return res->SetResult;
}

inline SaErrorT rptDefault(SaHpiDomainIdT, SaHpiResourceIdT Rid)
{
    called("RptDefault", Rid);
    return SA_OK;
}

// The tables a plug-in would register, with the library's defaults in the
// parameter-control slots.
inline KviDsRdrFnTable sensorTable()
{
    KviDsRdrFnTable t{};
    t.SensorThresholdsGet = thresholdsGet;
    t.SensorThresholdsSet = thresholdsSet;
    t.SensorEventEnablesGet = enablesGet;
    t.SensorEventEnablesSet = enablesSet;
    t.RdrSaveParmControl = kviCsRdrSaveSensorParmControl;
    t.RdrRestoreParmControl = kviCsRdrRestoreSensor;
    return t;
}

inline KviDsRdrFnTable ctrlTable()
{
    KviDsRdrFnTable t{};
    t.ControlStateGet = ctrlGet;
    t.ControlStateSet = ctrlSet;
    t.RdrDefaultParmControl = kviCsRestoreControlDefaults;
    t.RdrSaveParmControl = kviCsRdrSaveCtrlParmControl;
    t.RdrRestoreParmControl = kviCsRdrRestoreCtrl;
    return t;
}

inline KviDsRptFnTable rptTable()
{
    KviDsRptFnTable t{};
    t.EventLogStateGet = evtLogGet;
    t.EventLogStateSet = evtLogSet;
    t.RptDefaultParmControl = rptDefault;
    t.RptSaveParmControl = kviCsRptSaveParmControl;
    t.RptRestoreParmControl = kviCsRptRestoreParmControl;
    return t;
}

inline SaHpiRdrT sensorRdr(SaHpiBoolT IsThreshold, SaHpiSensorEventCtrlT EventCtrl,
                           SaHpiSensorThdMaskT Writable = 0x3F)
{
    SaHpiRdrT r{};
    r.RdrType = SAHPI_SENSOR_RDR;
    r.RdrTypeUnion.SensorRec.Category = SAHPI_EC_THRESHOLD;
    r.RdrTypeUnion.SensorRec.EventCtrl = EventCtrl;
    r.RdrTypeUnion.SensorRec.ThresholdDefn.IsThreshold = IsThreshold;
    r.RdrTypeUnion.SensorRec.ThresholdDefn.WriteThold = Writable;
    return r;
}

inline SaHpiRdrT ctrlRdr(SaHpiCtrlTypeT Type = SAHPI_CTRL_TYPE_DISCRETE, SaHpiBoolT Ignore = 0)
{
    SaHpiRdrT r{};
    r.RdrType = SAHPI_CTRL_RDR;
    r.RdrTypeUnion.CtrlRec.Type = Type;
    r.RdrTypeUnion.CtrlRec.Ignore = Ignore;
    return r;
}

inline SaHpiTextBufferT text(const char *s)
{
    SaHpiTextBufferT t{};
    t.DataType = SAHPI_TL_TYPE_LANGUAGE;
    t.Language = SAHPI_LANG_ENGLISH;
    t.DataLength = static_cast<SaHpiUint8T>(strlen(s));
    memcpy(t.Data, s, t.DataLength);
    return t;
}

inline std::string str(const SaHpiTextBufferT &t)
{
    return std::string(reinterpret_cast<const char *>(t.Data), t.DataLength);
}

inline SaHpiSensorReadingT reading(SaHpiUint32T Raw)
{
    SaHpiSensorReadingT r{};
    r.ValuesPresent = SAHPI_SRF_RAW;
    r.Raw = Raw;
    return r;
}

inline SaHpiSensorThresholdsT thresholds(SaHpiUint32T Base)
{
    SaHpiSensorThresholdsT t{};
    t.LowCritical = reading(Base + 1);
    t.LowMajor = reading(Base + 2);
    t.LowMinor = reading(Base + 3);
    t.UpCritical = reading(Base + 4);
    t.UpMajor = reading(Base + 5);
    t.UpMinor = reading(Base + 6);
    t.PosThdHysteresis = reading(Base + 7);
    t.NegThdHysteresis = reading(Base + 8);
    return t;
}

inline bool same(const void *a, const void *b, size_t n)
{
    return memcmp(a, b, n) == 0;
}

// A line with the text written at the level, as the logger labels it.
inline bool loggedAt(const KviLogCapture &Log, SaHpiUint32T Level, const std::string &Text)
{
    const char *label = Level >= KVI_LOG_ERR_NONFATAL_NUM ? KVI_LOG_ERROR_STRING
                        : Level == KVI_LOG_WARN_NUM       ? KVI_LOG_WARNING_STRING
                                                          : KVI_LOG_DEBUG_STRING;
    char tag[32];
    snprintf(tag, sizeof tag, "%s %3.3u", label, Level);
    for (const std::string &line : Log.matching(Text))
        if (line.find(tag) != std::string::npos)
            return true;
    return false;
}

// The key of a record's setting in domain 0.
inline std::string rdrKey(const char *Prefix, int Flag, SaHpiResourceIdT Rid, unsigned Num)
{
    char key[KVI_MAX_NV_KEY_LENGTH];
    snprintf(key, sizeof key, "%s%d%8.8x%8.8x%2.2x", Prefix, Flag, 0u, Rid, Num);
    return key;
}

inline std::string rptKey(const char *Prefix, int Flag, SaHpiResourceIdT Rid)
{
    char key[KVI_MAX_NV_KEY_LENGTH];
    snprintf(key, sizeof key, "%s%d%8.8x%8.8x", Prefix, Flag, 0u, Rid);
    return key;
}

// The stored length of the object under Key (0 when there is none).
inline SaHpiUint32T storedLength(const std::string &Key)
{
    std::vector<char> buffer(70000);
    SaHpiUint32T read = 0;
    SaErrorT rc = kviCsNonVolatileGet(Key.c_str(), 0, static_cast<SaHpiUint32T>(buffer.size()),
                                      buffer.data(), &read);
    return rc == SA_OK || rc == SA_ERR_HPI_DATA_TRUNCATED ? read : 0;
}

inline bool stored(const std::string &Key)
{
    return storedLength(Key) != 0;
}

// The store in a fresh directory, the domain and RDR tables (once per
// process), and the resources a test adds, removed again afterwards.
class ParmControlTest : public testing::Test
{
  protected:
    static constexpr SaHpiDomainIdT DOM = SAHPI_DEFAULT_DOMAIN_ID;

    void SetUp() override
    {
        calls.clear();
        SaErrorT rc = kviCsDomainInitialize();
        ASSERT_TRUE(rc == SA_OK || rc == SA_ERR_HPI_DUPLICATE);
        kviCsRptInitialize();
        rc = kviCsRdrInitialize();
        ASSERT_TRUE(rc == SA_OK || rc == SA_ERR_HPI_DUPLICATE);
        std::string conf = "KviNvStorageDir = \"" + tmp_.path() + "/nv\"\n";
        ASSERT_EQ(kviCsConfigInit(SAHPI_FALSE, tmp_.write("nv.conf", conf).c_str()), SA_OK);
        ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    }

    void TearDown() override
    {
        for (SaHpiResourceIdT rid : added_)
            kviCsRptEntryRemoveByRid(DOM, rid);
        kviCsNonVolatileFinalize();
        kviCsConfigFinalize();
    }

    // One record as the test describes it; its number is the one the RDR
    // table gave it.
    struct Record {
        SaHpiRdrT Rdr;
        KviDsRdrFnTable Table;
        FakeRecord *State;
    };

    // Adds an active resource with the records given (in this order; they
    // get numbers 1, 2, ...). Returns its id.
    SaHpiResourceIdT addResource(std::vector<Record *> Records, const char *Tag = "discovered",
                                 SaHpiSeverityT Severity = SAHPI_MINOR,
                                 const KviDsRptFnTable &Table = rptTable())
    {
        SaHpiRptEntryT entry{};
        entry.ResourceCapabilities = SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_SENSOR |
                                     SAHPI_CAPABILITY_CONTROL | SAHPI_CAPABILITY_CONFIGURATION;
        entry.ResourceSeverity = Severity;
        entry.ResourceTag = text(Tag);
        resources_.push_back(std::make_unique<FakeResource>());
        KviDsRptFnTable table = Table;
        SaHpiResourceIdT rid = 0;
        EXPECT_EQ(kviCsRptEntryAdd(DOM, entry, resources_.back().get(), SAHPI_FALSE, &table, 1,
                                   &lock_, &rid),
                  SA_OK);
        for (Record *r : Records) {
            SaHpiEntryIdT id = 0;
            KviCsRdrRecordNumT num{};
            EXPECT_EQ(kviCsRdrAdd(DOM, rid, &r->Rdr, r->State, &r->Table, &id, &num), SA_OK);
        }
        EXPECT_EQ(kviCsRptEntryActiveStateSetByRid(DOM, rid, SAHPI_TRUE), SA_OK);
        added_.push_back(rid);
        return rid;
    }

    FakeResource *resource(SaHpiResourceIdT Rid)
    {
        void *user = nullptr;
        EXPECT_EQ(kviCsRptEntryUserPointerGetByRid(DOM, Rid, &user), SA_OK);
        return static_cast<FakeResource *>(user);
    }

    SaHpiRptEntryT entry(SaHpiResourceIdT Rid)
    {
        SaHpiRptEntryT e{};
        SaHpiBoolT active = SAHPI_FALSE;
        EXPECT_EQ(kviCsRptEntryGetByRid(DOM, Rid, &e, &active, nullptr), SA_OK);
        return e;
    }

    FakeRecord *fake()
    {
        records_.push_back(std::make_unique<FakeRecord>());
        return records_.back().get();
    }

    // Restarts the store, as a restart of the daemon would.
    void restartStore()
    {
        ASSERT_EQ(kviCsNonVolatileFinalize(), SA_OK);
        ASSERT_EQ(kviCsNonVolatileInitialize(), SA_OK);
    }

    KviTempDir tmp_;
    KviCsRwLockT lock_{};
    std::vector<SaHpiResourceIdT> added_;
    std::vector<std::unique_ptr<FakeResource>> resources_;
    std::vector<std::unique_ptr<FakeRecord>> records_;
};

} // namespace pctest
