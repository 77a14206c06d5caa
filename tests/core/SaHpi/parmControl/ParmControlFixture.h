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

// The shapes of every fake slot: note the call, then hand out or take in the
// field, failing as the fake was told.
template <typename Fake, typename T>
SaErrorT fakeGet(const char *Slot, SaHpiResourceIdT Rid, unsigned Num, void *User, T Fake::*Field,
                 T *Out)
{
    calls.push_back(std::string(Slot) + " " + std::to_string(Rid) + "/" + std::to_string(Num));
    *Out = static_cast<Fake *>(User)->*Field;
    return static_cast<Fake *>(User)->GetResult;
}
template <typename Fake, typename T>
SaErrorT fakeSet(const char *Slot, SaHpiResourceIdT Rid, unsigned Num, void *User, T Fake::*Field,
                 const T *In)
{
    calls.push_back(std::string(Slot) + " " + std::to_string(Rid) + "/" + std::to_string(Num));
    auto *fake = static_cast<Fake *>(User);
    if (fake->SetResult == SA_OK)
        fake->*Field = *In;
    return fake->SetResult;
}

using D = SaHpiDomainIdT;
using R = SaHpiResourceIdT;

// The tables a plug-in would register, with the library's defaults in the
// parameter-control slots.
inline KviDsRdrFnTable sensorTable()
{
    KviDsRdrFnTable t{};
    t.SensorThresholdsGet = [](D, R Rid, SaHpiSensorNumT Num, SaHpiRdrT *, void *U,
                               SaHpiSensorThresholdsT *T) {
        return fakeGet("ThresholdsGet", Rid, Num, U, &FakeRecord::Thresholds, T);
    };
    t.SensorThresholdsSet = [](D, R Rid, SaHpiSensorNumT Num, SaHpiRdrT *,
                               SaHpiSensorThresholdsT *T, void *U) {
        return fakeSet("ThresholdsSet", Rid, Num, U, &FakeRecord::Thresholds, T);
    };
    t.SensorEventEnablesGet = [](D, R Rid, SaHpiSensorNumT Num, void *U, SaHpiCapabilitiesT Caps,
                                 SaHpiEventCategoryT, SaHpiSensorEvtEnablesT *E) {
        static_cast<FakeRecord *>(U)->CapabilitiesSeen = Caps;
        return fakeGet("EnablesGet", Rid, Num, U, &FakeRecord::Enables, E);
    };
    t.SensorEventEnablesSet = [](D, R Rid, SaHpiSensorNumT Num, SaHpiSensorEvtEnablesT *E,
                                 SaHpiRdrT *, SaHpiCapabilitiesT Caps, void *U) {
        static_cast<FakeRecord *>(U)->CapabilitiesSeen = Caps;
        return fakeSet("EnablesSet", Rid, Num, U, &FakeRecord::Enables, E);
    };
    t.RdrSaveParmControl = kviCsRdrSaveSensorParmControl;
    t.RdrRestoreParmControl = kviCsRdrRestoreSensor;
    return t;
}

inline KviDsRdrFnTable ctrlTable()
{
    KviDsRdrFnTable t{};
    t.ControlStateGet = [](D, R Rid, SaHpiCtrlNumT Num, void *U, SaHpiCtrlStateT *State) {
        static_cast<FakeRecord *>(U)->LineAsked = State->StateUnion.Text.Line;
        return fakeGet("CtrlGet", Rid, Num, U, &FakeRecord::Ctrl, State);
    };
    t.ControlStateSet = [](D, R Rid, SaHpiCtrlNumT Num, SaHpiCtrlStateT *State, void *U) {
        return fakeSet("CtrlSet", Rid, Num, U, &FakeRecord::Ctrl, State);
    };
    t.RdrDefaultParmControl = kviCsRestoreControlDefaults;
    t.RdrSaveParmControl = kviCsRdrSaveCtrlParmControl;
    t.RdrRestoreParmControl = kviCsRdrRestoreCtrl;
    return t;
}

inline KviDsRptFnTable rptTable()
{
    KviDsRptFnTable t{};
    t.EventLogStateGet = [](D, R Rid, void *U, SaHpiBoolT *Enable) {
        return fakeGet("EvtLogGet", Rid, 0, U, &FakeResource::EventLog, Enable);
    };
    t.EventLogStateSet = [](D, R Rid, SaHpiBoolT Enable, void *U) {
        return fakeSet("EvtLogSet", Rid, 0, U, &FakeResource::EventLog, &Enable);
    };
    t.RptDefaultParmControl = [](D, R Rid) {
        calls.push_back("RptDefault " + std::to_string(Rid) + "/0");
        return SA_OK;
    };
    t.RptSaveParmControl = kviCsRptSaveParmControl;
    t.RptRestoreParmControl = kviCsRptRestoreParmControl;
    return t;
}

inline SaHpiTextBufferT text(const char *s)
{
    SaHpiTextBufferT t{
        SAHPI_TL_TYPE_LANGUAGE, SAHPI_LANG_ENGLISH, static_cast<SaHpiUint8T>(strlen(s)), {}};
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

// Base + 1 to Base + 8 from LowCritical on, in field order.
inline SaHpiSensorThresholdsT thresholds(SaHpiUint32T Base)
{
    return {reading(Base + 1), reading(Base + 2), reading(Base + 3), reading(Base + 4),
            reading(Base + 5), reading(Base + 6), reading(Base + 7), reading(Base + 8)};
}

inline SaHpiCtrlStateT discrete(SaHpiCtrlStateDiscreteT Value)
{
    SaHpiCtrlStateT s{SAHPI_CTRL_TYPE_DISCRETE, {}};
    s.StateUnion.Discrete = Value;
    return s;
}

inline bool same(const void *a, const void *b, size_t n)
{
    return memcmp(a, b, n) == 0;
}

// A line with the text written at the level.
inline bool loggedAt(const KviLogCapture &Log, SaHpiUint32T Level, const std::string &Text)
{
    char tag[8];
    snprintf(tag, sizeof tag, " %3.3u ", Level);
    for (const std::string &line : Log.matching(Text))
        if (line.find(tag) != std::string::npos)
            return true;
    return false;
}

// The key of a setting of resource Rid in domain 0, or of its record Num.
inline std::string nvKey(const char *Prefix, int Flag, SaHpiResourceIdT Rid, int Num = -1)
{
    char key[64];
    int n = snprintf(key, sizeof key, "%s%d%8.8x%8.8x", Prefix, Flag, 0u, Rid);
    if (Num >= 0)
        snprintf(key + n, sizeof key - n, "%2.2x", Num);
    return key;
}

// The stored length of the object under Key (0 when there is none).
inline SaHpiUint32T storedLength(const std::string &Key)
{
    std::vector<char> buffer(70000);
    SaHpiUint32T read = 0;
    SaErrorT rc = kviCsNonVolatileGet(Key.c_str(), 0, 70000, buffer.data(), &read);
    return rc == SA_OK || rc == SA_ERR_HPI_DATA_TRUNCATED ? read : 0;
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
        kviCsDomainInitialize();
        kviCsRptInitialize();
        kviCsRdrInitialize();
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
    // table gives it (1, 2, ... in the order of addResource's list).
    struct Record {
        SaHpiRdrT Rdr;
        KviDsRdrFnTable Table;
        FakeRecord *State;
    };

    Record sensor(SaHpiBoolT IsThreshold = SAHPI_TRUE,
                  SaHpiSensorEventCtrlT EventCtrl = SAHPI_SEC_PER_EVENT,
                  SaHpiSensorThdMaskT Writable = 0x3F)
    {
        Record r{{}, sensorTable(), fake()};
        r.Rdr.RdrType = SAHPI_SENSOR_RDR;
        SaHpiSensorRecT &s = r.Rdr.RdrTypeUnion.SensorRec;
        s.Category = SAHPI_EC_THRESHOLD;
        s.EventCtrl = EventCtrl;
        s.ThresholdDefn.IsThreshold = IsThreshold;
        s.ThresholdDefn.WriteThold = Writable;
        return r;
    }
    Record control(SaHpiCtrlTypeT Type = SAHPI_CTRL_TYPE_DISCRETE, SaHpiBoolT Ignore = SAHPI_FALSE)
    {
        Record r{{}, ctrlTable(), fake()};
        r.Rdr.RdrType = SAHPI_CTRL_RDR;
        r.Rdr.RdrTypeUnion.CtrlRec.Type = Type;
        r.Rdr.RdrTypeUnion.CtrlRec.Ignore = Ignore;
        return r;
    }

    // Adds an active resource with the records given. Returns its id.
    SaHpiResourceIdT addResource(std::vector<Record *> Records, const char *Tag = "discovered",
                                 SaHpiSeverityT Severity = SAHPI_MINOR,
                                 KviDsRptFnTable Table = rptTable())
    {
        SaHpiRptEntryT entry{};
        entry.ResourceCapabilities = SAHPI_CAPABILITY_RESOURCE | SAHPI_CAPABILITY_SENSOR |
                                     SAHPI_CAPABILITY_CONTROL | SAHPI_CAPABILITY_CONFIGURATION;
        entry.ResourceSeverity = Severity;
        entry.ResourceTag = text(Tag);
        resources_.push_back(std::make_unique<FakeResource>());
        SaHpiResourceIdT rid = 0;
        EXPECT_EQ(kviCsRptEntryAdd(DOM, entry, resources_.back().get(), SAHPI_FALSE, &Table, 1,
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

    KviTempDir tmp_;
    KviCsRwLockT lock_{};
    std::vector<SaHpiResourceIdT> added_;
    std::vector<std::unique_ptr<FakeResource>> resources_;
    std::vector<std::unique_ptr<FakeRecord>> records_;
};

} // namespace pctest
