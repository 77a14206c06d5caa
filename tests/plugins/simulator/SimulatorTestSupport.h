// What the simulator's tests share: where the built plug-in is, and the
// shelf as a client finds it in the library's tables.
#pragma once

#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <map>
#include <string>
#include <vector>

#include "KviDaemonCore.h"
#include "kvi/KviMaplManager.h"

namespace
{

inline std::string simulatorPath()
{
#ifdef KVI_SIMULATOR_PATH
    return KVI_SIMULATOR_PATH;
#else
    const char *dir = getenv("KVI_TEST_BINARY_DIR");
    return std::string(dir != nullptr ? dir : ".") + "/../plugins/libKviSimulator.so";
#endif
}

// The test program links the library statically; the plug-in resolves its
// library symbols against the program, so every one it uses must be linked
// in even where the test itself does not call it.
[[maybe_unused]] volatile const void *const PluginImports[] = {
    reinterpret_cast<const void *>(&kviCsCfgDataUint32Get),
    reinterpret_cast<const void *>(&kviCsDefaultEirSet),
    reinterpret_cast<const void *>(&kviCsDefaultWatchdogSet),
    reinterpret_cast<const void *>(&kviCsRdrAdd),
    reinterpret_cast<const void *>(&kviCsRdrGetSensor),
    reinterpret_cast<const void *>(&kviCsRdrGetWatchdog),
    reinterpret_cast<const void *>(&kviCsRptEntryActiveStateSetByRid),
    reinterpret_cast<const void *>(&kviCsRptEntryAdd),
    reinterpret_cast<const void *>(&kviCsRptEntryGetByRid),
    reinterpret_cast<const void *>(&kviCsRptEntryModifyByRid),
    reinterpret_cast<const void *>(&kviCsRptEntryRemoveByRid),
    reinterpret_cast<const void *>(&kviDsMaplManagerGetMaplLock),
    reinterpret_cast<const void *>(&kviCsGetSaHpiTime),
    reinterpret_cast<const void *>(&kviCsMalloc),
    reinterpret_cast<const void *>(&kviCsFree),
    reinterpret_cast<const void *>(&kviCsLogger),
};

constexpr SaHpiDomainIdT DOMAIN = SAHPI_DEFAULT_DOMAIN_ID;
constexpr SaHpiUint32T LOCKS = 3;

inline std::string textOf(const SaHpiTextBufferT &T)
{
    return std::string(reinterpret_cast<const char *>(T.Data), T.DataLength);
}

inline SaHpiTextBufferT textBuffer(const std::string &S)
{
    SaHpiTextBufferT t{};
    t.DataType = SAHPI_TL_TYPE_LANGUAGE;
    t.Language = SAHPI_LANG_ENGLISH;
    t.DataLength = static_cast<SaHpiUint8T>(S.size());
    memcpy(t.Data, S.data(), S.size());
    return t;
}

struct Record {
    SaHpiRdrT Rdr;
    KviDsRdrFnTable Fn;
    void *UserData;
};

struct Resource {
    SaHpiRptEntryT Entry;
    KviDsRptFnTable Fn;
    void *UserDefined;
    SaHpiUint32T MaplNum;
    KviCsRwLockT *Lock;
    std::vector<Record> Records;
};

// The shelf as a client finds it: the active RPT entries in walk order and,
// for each, its records in walk order.
struct Shelf {
    std::vector<SaHpiResourceIdT> Order;
    std::map<std::string, Resource> ByTag;
};

inline Shelf walkShelf()
{
    Shelf shelf;
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    while (entry != SAHPI_LAST_ENTRY) {
        SaHpiEntryIdT next = 0;
        Resource r{};
        void *user = nullptr;
        if (kviCsRptActiveEntryGet(DOMAIN, entry, &next, &r.Entry, &user) != SA_OK) {
            ADD_FAILURE() << "RPT walk stopped at entry " << entry;
            break;
        }
        SaHpiResourceIdT rid = r.Entry.ResourceId;
        EXPECT_EQ(kviCsRptActiveEntryGetByRid(DOMAIN, rid, nullptr, &r.Fn, &r.UserDefined,
                                              &r.MaplNum, &r.Lock),
                  SA_OK);
        EXPECT_EQ(user, r.UserDefined);
        SaHpiEntryIdT rdrEntry = SAHPI_FIRST_ENTRY;
        while (rdrEntry != SAHPI_LAST_ENTRY) {
            Record rec{};
            SaHpiBoolT active = SAHPI_FALSE;
            SaHpiEntryIdT rdrNext = 0;
            if (kviCsRdrGet(DOMAIN, rid, SAHPI_NO_RECORD, rdrEntry, &rdrNext, &rec.Rdr, &active,
                            &rec.UserData, &rec.Fn, nullptr, nullptr) != SA_OK) {
                ADD_FAILURE() << "RDR walk of rid " << rid << " stopped at " << rdrEntry;
                break;
            }
            EXPECT_TRUE(active);
            r.Records.push_back(rec);
            rdrEntry = rdrNext;
        }
        shelf.Order.push_back(rid);
        shelf.ByTag[textOf(r.Entry.ResourceTag)] = r;
        entry = next;
    }
    return shelf;
}

} // namespace
