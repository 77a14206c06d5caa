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
    for (SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY, next = 0; entry != SAHPI_LAST_ENTRY;
         entry = next) {
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
        for (SaHpiEntryIdT at = SAHPI_FIRST_ENTRY, after = 0; at != SAHPI_LAST_ENTRY; at = after) {
            Record rec{};
            SaHpiBoolT active = SAHPI_FALSE;
            if (kviCsRdrGet(DOMAIN, rid, SAHPI_NO_RECORD, at, &after, &rec.Rdr, &active,
                            &rec.UserData, &rec.Fn, nullptr, nullptr) != SA_OK) {
                ADD_FAILURE() << "RDR walk of rid " << rid << " stopped at " << at;
                break;
            }
            EXPECT_TRUE(active);
            r.Records.push_back(rec);
        }
        shelf.Order.push_back(rid);
        shelf.ByTag[textOf(r.Entry.ResourceTag)] = r;
    }
    return shelf;
}

} // namespace
