// The test plug-ins built from tests/plugins/KviTestMapl.c, and the
// configuration files that list them.
#pragma once

#include <dlfcn.h>
#include <unistd.h>

#include <cstdlib>
#include <string>
#include <string_view>

#include "support/KviTestSupport.h"

// Where the build put a test plug-in, e.g. kviTestMaplPath("KviTestMaplGoodA").
inline std::string kviTestMaplPath(std::string_view Name)
{
    const char *dir = getenv("KVI_TEST_BINARY_DIR");
    return std::string(dir != nullptr ? dir : ".") + "/plugins/lib" + std::string(Name) + ".so";
}

// A look into a plug-in that is loaded now, without loading it. The test's
// own reference goes at the end of the scope, so keep the object short-lived:
// while it lives, an unload by the manager leaves the library mapped.
class KviLoadedMapl
{
  public:
    explicit KviLoadedMapl(const std::string &Path)
        : handle_(dlopen(Path.c_str(), RTLD_NOW | RTLD_NOLOAD))
    {
    }
    ~KviLoadedMapl()
    {
        if (handle_ != nullptr)
            dlclose(handle_);
    }
    KviLoadedMapl(const KviLoadedMapl &) = delete;
    KviLoadedMapl &operator=(const KviLoadedMapl &) = delete;

    bool loaded() const { return handle_ != nullptr; }
    SaHpiUint32T slot() const { return call<SaHpiUint32T>("kviTestMaplSlot"); }
    SaHpiResourceIdT resource() const { return call<SaHpiResourceIdT>("kviTestMaplResource"); }
    int slowCallsRunning() const { return call<int>("kviTestMaplSlowCallsRunning"); }
    void releaseSlowCalls() const { call<void>("kviTestMaplReleaseSlowCalls"); }

  private:
    template <typename R> R call(const char *Name) const
    {
        auto *fn = reinterpret_cast<R (*)()>(dlsym(handle_, Name));
        return fn();
    }
    void *handle_;
};

inline bool kviTestMaplLoaded(std::string_view Name)
{
    return KviLoadedMapl(kviTestMaplPath(Name)).loaded();
}

// "a;b;c" of the plug-ins' paths.
inline std::string kviTestMaplList(std::initializer_list<std::string_view> Names)
{
    std::string list;
    for (std::string_view name : Names)
        list += (list.empty() ? "" : ";") + kviTestMaplPath(name);
    return list;
}

// A configuration file with the plug-in list and the given further lines.
inline std::string kviTestMaplConfig(std::string_view Modules, std::string_view More = "")
{
    return "mapl_modules = \"" + std::string(Modules) + "\"\n" + std::string(More);
}

// The name in slot MaplNum, or an empty string when there is none.
inline std::string kviTestMaplNameIn(SaHpiUint32T MaplNum)
{
    SaHpiInt8T name[2048] = {};
    if (kviDsMaplManagerGetMaplName(MaplNum, sizeof name, name) != SA_OK)
        return "";
    return reinterpret_cast<const char *>(name);
}

// Whether a line with Text was written at the threshold level Level.
inline bool kviTestLoggedAt(const KviLogCapture &Log, SaHpiUint32T Level, std::string_view Text)
{
    const std::string tag =
        " " + std::string(Level < 10 ? "00" : "0") + std::to_string(Level) + " ";
    for (const std::string &line : Log.matching(Text))
        if (line.find(tag) != std::string::npos)
            return true;
    return false;
}

// Polls Done every few milliseconds for up to TimeoutMs.
template <typename Pred> bool kviTestWaitFor(Pred Done, int TimeoutMs = 5000)
{
    for (int waited = 0; waited < TimeoutMs; waited += 5) {
        if (Done())
            return true;
        usleep(5000);
    }
    return Done();
}

// Calls the resource's ResourcePowerStateGet slot the way a redirected call
// reaches a plug-in: the master lock for reading, the plug-in lock stored with
// the resource for reading, the master lock released, then the call.
inline SaErrorT kviTestCallIntoPlugin(SaHpiResourceIdT ResourceId)
{
    KviCsRwLockT *master = nullptr;
    if (kviDsMaplManagerGetMaplMasterLock(&master) != SA_OK)
        return SA_ERR_HPI_ERROR;
    if (KVI_CS_RW_LOCK_RD_LOCK(master, 1000) != SA_OK)
        return SA_ERR_HPI_NO_RESPONSE;
    KviDsRptFnTable table{};
    void *user = nullptr;
    SaHpiUint32T mapl = 0;
    KviCsRwLockT *lock = nullptr;
    SaErrorT rc = kviCsRptActiveEntryGetByRid(SAHPI_DEFAULT_DOMAIN_ID, ResourceId, nullptr, &table,
                                              &user, &mapl, &lock);
    if (rc == SA_OK)
        rc = KVI_CS_RW_LOCK_RD_LOCK(lock, 1000);
    KVI_CS_RW_LOCK_RD_UNLOCK(master);
    if (rc != SA_OK)
        return rc;
    SaHpiHsPowerStateT state = SAHPI_HS_POWER_OFF;
    rc = table.ResourcePowerStateGet(SAHPI_DEFAULT_DOMAIN_ID, ResourceId, user, &state);
    KVI_CS_RW_LOCK_RD_UNLOCK(lock);
    return rc;
}
