// The plug-in manager. Plug-ins are found by the file names listed in
// "mapl_modules"; a name is a plug-in's identity, so the loaded set is brought
// in line with the list by comparing names. Each plug-in gets a fixed pool of
// reader/writer locks: a redirected call holds one of them for reading while
// it runs in the plug-in, and unloading takes all of them for writing, so a
// plug-in is never closed under a running call.
#include "daemon/maplManager/MaplManager.h"

#include <dlfcn.h>

#include <algorithm>
#include <climits>
#include <cstdint>
#include <cstdlib>
#include <cstring>

#include "core/utils/KviTrace.h"
#include "kvi/KviConfig.h"
#include "kvi/KviMemory.h"
#include "kvi/KviRpt.h"

namespace
{

constexpr SaHpiUint32T MAX_MAPLS = 10;
constexpr SaHpiUint32T MAX_RWLOCKS_PER_MAPL = 10;
constexpr SaHpiUint32T LIMIT_TEXT_LENGTH = 30;
constexpr SaHpiUint32T CONFIG_FILE_MAPL_MODULES_STRING_LENGTH = 2048;
// Loading and name lookup wait briefly for the master lock; unloading
// everything and discovery wait as long as a plug-in call may take.
constexpr SaHpiUint32T MAPL_MASTER_LOCK_TIMEOUT = 1000;
constexpr SaHpiUint32T MAPL_MASTER_LOCK_LONG_TIMEOUT = 10000;
constexpr SaHpiUint32T MAPL_LOCK_UNLOAD_TIMEOUT = 10000;
constexpr SaHpiUint32T NO_SLOT = UINT32_MAX;

KviDsMaplManagerRepositoryT MaplManagerRepository;
SaHpiBoolT Initialized = SAHPI_FALSE;

const char *nameOf(const KviDsMaplEntryT &Slot) noexcept
{
    return reinterpret_cast<const char *>(Slot.FileName);
}

// Whether Count elements of Size bytes can be asked of the allocator, whose
// sizes are 32-bit signed.
bool fitsAllocation(SaHpiUint32T Count, size_t Size) noexcept
{
    return static_cast<uint64_t>(Count) * Size <= static_cast<uint64_t>(KVI_MAX_INT32);
}

// A slot or lock limit from the configuration. The text is read as a 32-bit
// long would read it, so the daemon sees the same limit on every platform.
SaHpiUint32T readLimit(const char *Key, SaHpiUint32T Default) noexcept
{
    char text[LIMIT_TEXT_LENGTH] = "";
    const SaErrorT rc = kviCsCfgDataGet(Key, sizeof text, text, nullptr);
    if (rc == SA_ERR_HPI_NOT_PRESENT)
        return Default;
    if (rc != SA_OK) {
        KVI_WLOG(KVI_LOG_WARN, "Unexpected return code of %d when recovering %s", rc, Key);
        return Default;
    }
    const long value = std::clamp(strtol(text, nullptr, 10), long{INT32_MIN}, long{INT32_MAX});
    if (value == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid value %s for %s in config file.", text, Key);
        return Default;
    }
    return static_cast<SaHpiUint32T>(value);
}

SaErrorT readModuleList(char *Modules) noexcept
{
    const SaErrorT rc =
        kviCsCfgDataGet("mapl_modules", CONFIG_FILE_MAPL_MODULES_STRING_LENGTH, Modules, nullptr);
    switch (rc) {
    case SA_OK:
        return SA_OK;
    case SA_ERR_HPI_DATA_TRUNCATED:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't get module list from config file-- too long.");
        return SA_ERR_HPI_DATA_TRUNCATED;
    case SA_ERR_HPI_NOT_PRESENT:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Config file doesn't have mapl_modules specified.");
        return SA_ERR_HPI_NOT_PRESENT;
    default:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unknown error getting mapl_modules from config file.");
        return SA_ERR_HPI_ERROR;
    }
}

// The slot that holds the plug-in listed as Name, NO_SLOT if none does.
SaHpiUint32T findLoaded(const char *Name) noexcept
{
    for (SaHpiUint32T i = 0; i < MaplManagerRepository.MaxMapls; i++) {
        const KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[i];
        if (slot.InUse == SAHPI_TRUE && slot.FileName != nullptr &&
            strncmp(nameOf(slot), Name, CONFIG_FILE_MAPL_MODULES_STRING_LENGTH) == 0)
            return i;
    }
    return NO_SLOT;
}

SaErrorT isListed(const char *Modules, const char *Name, bool *Listed) noexcept
{
    char element[CONFIG_FILE_MAPL_MODULES_STRING_LENGTH];
    for (SaHpiUint32T k = 0;; k++) {
        const SaErrorT rc =
            kviGetListElement(k, Modules, CONFIG_FILE_MAPL_MODULES_STRING_LENGTH, element);
        if (rc == SA_ERR_HPI_NOT_PRESENT) {
            *Listed = false;
            return SA_OK;
        }
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "GetModuleName returned %d", rc);
            return SA_ERR_HPI_ERROR;
        }
        if (strncmp(element, Name, CONFIG_FILE_MAPL_MODULES_STRING_LENGTH) == 0) {
            *Listed = true;
            return SA_OK;
        }
    }
}

SaErrorT removeUnlisted(const char *Modules) noexcept
{
    for (SaHpiUint32T i = 0; i < MaplManagerRepository.MaxMapls; i++) {
        const KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[i];
        if (slot.InUse != SAHPI_TRUE)
            continue;
        bool listed = false;
        if (isListed(Modules, nameOf(slot), &listed) != SA_OK)
            return SA_ERR_HPI_ERROR;
        if (!listed && kviDsMaplManagerUnloadMapl(i) != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't remove MAPL %s", nameOf(slot));
    }
    return SA_OK;
}

// In list order, so that plug-ins take the free slots in the order listed. A
// name listed twice finds itself loaded the second time.
SaErrorT addListed(const char *Modules) noexcept
{
    char element[CONFIG_FILE_MAPL_MODULES_STRING_LENGTH];
    for (SaHpiUint32T k = 0;; k++) {
        const SaErrorT rc =
            kviGetListElement(k, Modules, CONFIG_FILE_MAPL_MODULES_STRING_LENGTH, element);
        if (rc == SA_ERR_HPI_NOT_PRESENT)
            return SA_OK;
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "GetModuleName returned %d", rc);
            return SA_ERR_HPI_ERROR;
        }
        if (findLoaded(element) == NO_SLOT && kviDsMaplManagerLoadMapl(element) != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Can't add MAPL %s", element);
    }
}

void closeLibrary(void *LibraryHandle) noexcept
{
    if (dlclose(LibraryHandle) != 0)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to close MAPL library!");
}

// Refuses a table that cannot be used, with the reason; the members are
// tested in a fixed order so the first missing one is the one reported.
SaErrorT checkInitTable(const char *FileName, const KviMaplInitTableT *Table) noexcept
{
    if (Table == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "dlsym returned a NULL KviModuleInitTable in %s.", FileName);
        return SA_ERR_HPI_ERROR;
    }
    if (Table->GetVersion == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KviModuleInitTable.GetVersion is NULL in %s.", FileName);
        return SA_ERR_HPI_ERROR;
    }
    SaHpiVersionT version = 0;
    if (Table->GetVersion(&version) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "GetVersion Failed!");
        return SA_ERR_HPI_ERROR;
    }
    if (version != KVI_MAPL_INTR_VERSION) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Unable to load Mapl %s - MaplVersion is %#x, MaplManager version is %#x",
                 FileName, version, KVI_MAPL_INTR_VERSION);
        return SA_ERR_HPI_ERROR;
    }
    const struct {
        bool missing;
        const char *format;
    } members[] = {
        {Table->ResourcesDiscover == nullptr,
         "KviModuleInitTable.ResourcesDiscover is NULL in %s."},
        {Table->MaplInitialization == nullptr, "moduleInitTable.MaplInitialization is NULL in %s."},
        {Table->MaplFinalization == nullptr, "moduleInitTable.MaplFinalization is NULL in %s."},
    };
    for (const auto &member : members) {
        if (member.missing) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, member.format, FileName);
            return SA_ERR_HPI_ERROR;
        }
    }
    return SA_OK;
}

// The lowest free slot, marked in use. Running out of slots stops the daemon:
// the configuration asks for more plug-ins than it allows.
SaHpiUint32T claimFreeSlot() noexcept
{
    for (SaHpiUint32T i = 0; i < MaplManagerRepository.MaxMapls; i++) {
        KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[i];
        KVI_DLOG(KVI_LOG_DBG_L, "InUse[%d]=%#x", i, slot.InUse);
        if (slot.InUse != SAHPI_TRUE) {
            slot.InUse = SAHPI_TRUE;
            return i;
        }
    }
    KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to add MAPL.  Max of %d is already present",
             MaplManagerRepository.MaxMapls);
    exit(1);
}

[[noreturn]] void registrationFailed(const char *Line, SaHpiUint32T Number) noexcept
{
    KVI_ELOG(KVI_LOG_ERR_FATAL, Line, Number);
    exit(1);
}

void fillSlot(KviDsMaplEntryT &Slot, const char *FileName, void *LibraryHandle,
              KviMaplInitTableT *ModuleInitTable) noexcept
{
    const size_t length = strlen(FileName) + 1;
    Slot.FileName = static_cast<SaHpiInt8T *>(KVI_CS_MALLOC(length));
    if (Slot.FileName == nullptr)
        registrationFailed("Unable to allocate memory for the name of Mapl (%u bytes)",
                           static_cast<SaHpiUint32T>(length));
    memcpy(Slot.FileName, FileName, length);
    if (fitsAllocation(Slot.NumLocks, sizeof(KviCsRwLockT)))
        Slot.RwLockList =
            static_cast<KviCsRwLockT *>(KVI_CS_MALLOC(Slot.NumLocks * sizeof(KviCsRwLockT)));
    if (Slot.RwLockList == nullptr)
        registrationFailed("Unable to allocate memory for %u Mapl locks", Slot.NumLocks);
    for (SaHpiUint32T j = 0; j < Slot.NumLocks; j++) {
        if (KVI_CS_RW_LOCK_INIT(&Slot.RwLockList[j]) != SA_OK)
            registrationFailed("Unable to initialize RwLock %d", j);
        KVI_DLOG(KVI_LOG_DBG_L, "Initalized RwLock %d", j);
    }
    Slot.LibraryHandle = LibraryHandle;
    Slot.ModuleInitTable = ModuleInitTable;
}

// The caller closes the library of a plug-in whose start failed, while its
// slot stays taken until a removal pass frees it. Nothing in the library may
// be reached after that: what it may have added to the RPT goes now, while
// its code is still mapped, and the slot forgets its table and handle.
void forgetLibrary(KviDsMaplEntryT &Slot, SaHpiUint32T MaplNum) noexcept
{
    const SaErrorT rc = kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, MaplNum);
    if (rc != SA_OK)
        KVI_WLOG(KVI_LOG_WARN, "kviCsRptEntrysRemoveByMapl failed (%d)", rc);
    Slot.ModuleInitTable = nullptr;
    Slot.LibraryHandle = nullptr;
}

} // namespace

// A release that must not fail: after a failure the lock's state is unknown,
// so the process ends with this call site's line.
#define MAPL_RELEASE_OR_DIE(UNLOCK, Lock, LEVEL, ...)                                              \
    do {                                                                                           \
        if (UNLOCK(Lock) != SA_OK) {                                                               \
            KVI_ELOG(LEVEL, __VA_ARGS__);                                                          \
            exit(1);                                                                               \
        }                                                                                          \
    } while (0)

#define INIT_CHECK()                                                                               \
    do {                                                                                           \
        if (Initialized != SAHPI_TRUE) {                                                           \
            KVI_WLOG(KVI_LOG_WARN, "MaplManager has not been initialized");                        \
            return SA_ERR_HPI_UNINITIALIZED;                                                       \
        }                                                                                          \
    } while (0)

namespace
{

// Every lock of the plug-in, in ascending order: this is what waits for the
// calls running in it. On a failure the locks taken so far are given back.
SaErrorT lockAllForWriting(KviDsMaplEntryT &Slot) noexcept
{
    for (SaHpiUint32T j = 0; j < Slot.NumLocks; j++) {
        if (KVI_CS_RW_LOCK_WR_LOCK(&Slot.RwLockList[j], MAPL_LOCK_UNLOAD_TIMEOUT) == SA_OK)
            continue;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to w-lock Mapl Lock %d", j);
        for (SaHpiUint32T held = 0; held < j; held++)
            MAPL_RELEASE_OR_DIE(KVI_CS_RW_LOCK_WR_UNLOCK, &Slot.RwLockList[held], KVI_LOG_ERR_FATAL,
                                "Unable to unlock rwlock %d.  Bailing", held);
        return SA_ERR_HPI_BUSY;
    }
    return SA_OK;
}

void finalizeAndClose(const KviDsMaplEntryT &Slot, SaHpiUint32T MaplNum) noexcept
{
    if (Slot.ModuleInitTable != nullptr) {
        const SaErrorT rc = Slot.ModuleInitTable->MaplFinalization();
        if (rc != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "ModuleFinalization failed (%d)  Continuing", rc);
        else
            KVI_DLOG(KVI_LOG_DBG_H, "Module Finalization Succeeded");
    }
    if (Slot.LibraryHandle != nullptr) {
        const int rc = dlclose(Slot.LibraryHandle);
        if (rc != 0)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                     "dlclose() failed with %d on closing mapl %d with handle %p continuing to "
                     "unload...",
                     rc, MaplNum, Slot.LibraryHandle);
    }
    KVI_ILOG(KVI_LOG_INFO, "Unloading Mapl %s", nameOf(Slot));
}

void releaseAndDestroyLocks(KviDsMaplEntryT &Slot) noexcept
{
    for (SaHpiUint32T j = 0; j < Slot.NumLocks; j++) {
        if (KVI_CS_RW_LOCK_WR_UNLOCK(&Slot.RwLockList[j]) != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to free Mapl Lock %d", j);
        if (KVI_CS_RW_LOCK_DESTROY(&Slot.RwLockList[j]) != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Couldn't destroy rwlock %d", j);
    }
}

void clearSlot(KviDsMaplEntryT &Slot) noexcept
{
    KVI_CS_FREE(Slot.FileName);
    KVI_CS_FREE(Slot.RwLockList);
    Slot.InUse = SAHPI_FALSE;
    Slot.ModuleInitTable = nullptr;
    Slot.LibraryHandle = nullptr;
}

SaErrorT lookUpLock(SaHpiUint32T MaplNum, SaHpiUint32T LockNum, KviCsRwLockT **MaplLock) noexcept
{
    if (MaplNum >= MaplManagerRepository.MaxMapls) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Mapl %d out of range", MaplNum);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[MaplNum];
    if (slot.InUse != SAHPI_TRUE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Mapl %d not in use", MaplNum);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    if (LockNum >= slot.NumLocks) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Lock %d out of range", LockNum);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    *MaplLock = &slot.RwLockList[LockNum];
    return SA_OK;
}

SaErrorT copyName(SaHpiUint32T MaplNum, SaHpiUint32T BufferSize, SaHpiInt8T *Buffer) noexcept
{
    if (MaplNum >= MaplManagerRepository.MaxMapls)
        return SA_ERR_HPI_INVALID;
    const KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[MaplNum];
    if (slot.InUse != SAHPI_TRUE)
        return SA_ERR_HPI_NOT_PRESENT;
    if (slot.FileName == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Mapl %d is in use, but has NULL FileName", MaplNum);
        return SA_ERR_HPI_ERROR;
    }
    const size_t size = strlen(nameOf(slot)) + 1;
    if (BufferSize < size)
        return SA_ERR_HPI_DATA_EX_LIMITS;
    memcpy(Buffer, slot.FileName, size);
    return SA_OK;
}

} // namespace

SaErrorT kviDsMaplManagerLoadMapl(const char *FileName) noexcept
{
    KVI_TRACE("FileName: %s", FileName != nullptr ? FileName : "");
    KVI_NULL_CHECK(FileName);
    dlerror();
    void *handle = dlopen(FileName, RTLD_NOW);
    const char *error = dlerror();
    if (handle == nullptr || error != nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "dlopen failed to open %s.  Returned %s", FileName,
                 error != nullptr ? error : "");
        if (handle != nullptr)
            closeLibrary(handle);
        return SA_ERR_HPI_ERROR;
    }
    auto *table = static_cast<KviMaplInitTableT *>(dlsym(handle, "KviMaplInitTable"));
    error = dlerror();
    if (error != nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "dlsym failed to find KviModuleInitTable in %s.  Returned %s", FileName, error);
        closeLibrary(handle);
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_H, "Address of KviModuleInitTable in %s is %p", FileName,
             static_cast<void *>(table));
    if (checkInitTable(FileName, table) != SA_OK) {
        closeLibrary(handle);
        return SA_ERR_HPI_ERROR;
    }
    const SaErrorT rc = kviDsMaplManagerRegisterMapl(FileName, handle, table);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviDsMaplManagerRegisterMapl failed for module %s.  rc=%d",
                 FileName, rc);
        closeLibrary(handle);
        return rc;
    }
    return SA_OK;
}

SaErrorT kviDsMaplManagerRegisterMapl(const char *FileName, void *LibraryHandle,
                                      KviMaplInitTableT *ModuleInitTable) noexcept
{
    KVI_TRACE("FileName: %s", FileName != nullptr ? FileName : "");
    KVI_NULL_CHECK(FileName);
    KVI_NULL_CHECK(LibraryHandle);
    KVI_NULL_CHECK(ModuleInitTable);
    INIT_CHECK();
    const SaHpiUint32T maplNum = claimFreeSlot();
    KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[maplNum];
    fillSlot(slot, FileName, LibraryHandle, ModuleInitTable);
    const SaErrorT rc = ModuleInitTable->MaplInitialization(maplNum);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "MaplInitialization failed in Mapl %s.  rc=%d", FileName,
                 rc);
        forgetLibrary(slot, maplNum);
        return rc;
    }
    return SA_OK;
}

SaErrorT kviDsMaplManagerUnloadMapl(SaHpiUint32T MaplNum) noexcept
{
    KVI_TRACE("MaplNum: %u", MaplNum);
    INIT_CHECK();
    if (MaplNum >= MaplManagerRepository.MaxMapls) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Mapl value %d passed in.  Bad.", MaplNum);
        return SA_ERR_HPI_ERROR;
    }
    KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[MaplNum];
    if (slot.InUse != SAHPI_TRUE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Request to remove Mapl %d, but Mapl not in use!", MaplNum);
        return SA_ERR_HPI_ERROR;
    }
    if (lockAllForWriting(slot) != SA_OK)
        return SA_ERR_HPI_BUSY;
    // Entries left behind would point into a closed library.
    const SaErrorT rc = kviCsRptEntrysRemoveByMapl(SAHPI_DEFAULT_DOMAIN_ID, MaplNum);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "kviCsRptEntrysRemoveByMapl failed (%d)", rc);
        exit(1);
    }
    finalizeAndClose(slot, MaplNum);
    releaseAndDestroyLocks(slot);
    clearSlot(slot);
    return SA_OK;
}

void kviDsMaplManagerConfigFileCallback(void) noexcept
{
    KVI_TRACE("");
    // A failure has been logged; the next change tries again.
    kviDsMaplManagerLoadMapls();
}

extern "C" {

KVI_EXPORT SaErrorT kviDsMaplManagerInitialize(void) noexcept
{
    KVI_TRACE("");
    if (Initialized == SAHPI_TRUE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Function called more than once-- bad");
        return SA_ERR_HPI_DUPLICATE;
    }
    if (KVI_CS_RW_LOCK_INIT(&MaplManagerRepository.MaplMasterLock) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to initialize the MaplMasterLock");
        exit(1);
    }
    const SaHpiUint32T maxMapls = readLimit("max_mapl_count", MAX_MAPLS);
    KVI_DLOG(KVI_LOG_DBG_H, "Max MAPLS supported: %d", maxMapls);
    const SaHpiUint32T numLocks = readLimit("max_mapl_rwlocks_count", MAX_RWLOCKS_PER_MAPL);
    KviDsMaplEntryT *slots = nullptr;
    if (fitsAllocation(maxMapls, sizeof(KviDsMaplEntryT)))
        slots = static_cast<KviDsMaplEntryT *>(KVI_CS_MALLOC(maxMapls * sizeof(KviDsMaplEntryT)));
    if (slots == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to allocate memory for MaplList");
        exit(1);
    }
    for (SaHpiUint32T i = 0; i < maxMapls; i++)
        slots[i] = KviDsMaplEntryT{SAHPI_FALSE, nullptr, nullptr, nullptr, numLocks, nullptr};
    MaplManagerRepository.MaxMapls = maxMapls;
    MaplManagerRepository.MaplList = slots;
    if (kviCsConfigRegister(kviDsMaplManagerConfigFileCallback, nullptr) != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Registration of callback failed!  New mapls can't be loaded");
    Initialized = SAHPI_TRUE;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviDsMaplManagerFinalize(void) noexcept
{
    KVI_TRACE("");
    if (Initialized != SAHPI_TRUE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviDsMaplManagerFinalize called when not initalized");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    // The table stays: a later saHpiInitialize loads into it again.
    if (kviCsConfigUnregister(kviDsMaplManagerConfigFileCallback, nullptr) != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unegistration of callback failed!");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviDsMaplManagerGetMaplMasterLock(KviCsRwLockT **MaplMasterLock) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(MaplMasterLock);
    INIT_CHECK();
    *MaplMasterLock = &MaplManagerRepository.MaplMasterLock;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviDsMaplManagerLoadMapls(void) noexcept
{
    KVI_TRACE("");
    INIT_CHECK();
    char modules[CONFIG_FILE_MAPL_MODULES_STRING_LENGTH];
    SaErrorT rc = readModuleList(modules);
    if (rc != SA_OK)
        return rc;
    rc = KVI_CS_RW_LOCK_WR_LOCK(&MaplManagerRepository.MaplMasterLock, MAPL_MASTER_LOCK_TIMEOUT);
    if (rc == SA_ERR_HPI_BUSY || rc == SA_ERR_HPI_TIMEOUT) {
        KVI_WLOG(KVI_LOG_WARN, "Unable to acquire MaplMasterLock");
        return SA_ERR_HPI_BUSY;
    }
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_RW_LOCK_TRY_RD_LOCK failed for MaplMasterLock rc=%d",
                 rc);
        return SA_ERR_HPI_ERROR;
    }
    // Removal first, so that the slots it frees are there for the additions.
    rc = removeUnlisted(modules);
    if (rc == SA_OK)
        rc = addListed(modules);
    MAPL_RELEASE_OR_DIE(KVI_CS_RW_LOCK_WR_UNLOCK, &MaplManagerRepository.MaplMasterLock,
                        KVI_LOG_ERR_FATAL, "Unable to unlock MAPL Master Lock");
    return rc;
}

KVI_EXPORT SaErrorT kviDsMaplManagerUnloadAllMapls(void) noexcept
{
    KVI_TRACE("");
    INIT_CHECK();
    const SaErrorT rc = KVI_CS_RW_LOCK_WR_LOCK(&MaplManagerRepository.MaplMasterLock,
                                               MAPL_MASTER_LOCK_LONG_TIMEOUT);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Couldn't acquire Mapl Master Lock.");
        return rc == SA_ERR_HPI_TIMEOUT ? SA_ERR_HPI_BUSY : SA_ERR_HPI_ERROR;
    }
    for (SaHpiUint32T i = 0; i < MaplManagerRepository.MaxMapls; i++) {
        if (MaplManagerRepository.MaplList[i].InUse != SAHPI_TRUE)
            continue;
        const SaErrorT unloaded = kviDsMaplManagerUnloadMapl(i);
        if (unloaded != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to unload mapl %d.  rc=%d", i, unloaded);
    }
    MAPL_RELEASE_OR_DIE(KVI_CS_RW_LOCK_WR_UNLOCK, &MaplManagerRepository.MaplMasterLock,
                        KVI_LOG_ERR_FATAL, "Couldn't unlock Mapl Master Lock.");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviDsMaplManagerDiscoverResources(SaHpiDomainIdT DomainId) noexcept
{
    KVI_TRACE("DomainId: %u", DomainId);
    INIT_CHECK();
    // Held for reading for the whole pass: no plug-in comes or goes meanwhile,
    // and plug-ins may ask for their locks from inside ResourcesDiscover.
    if (KVI_CS_RW_LOCK_RD_LOCK(&MaplManagerRepository.MaplMasterLock,
                               MAPL_MASTER_LOCK_LONG_TIMEOUT) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to lock read lock");
        return SA_ERR_HPI_BUSY;
    }
    for (SaHpiUint32T i = 0; i < MaplManagerRepository.MaxMapls; i++) {
        const KviDsMaplEntryT &slot = MaplManagerRepository.MaplList[i];
        if (slot.InUse != SAHPI_TRUE)
            continue;
        if (slot.ModuleInitTable == nullptr || slot.ModuleInitTable->ResourcesDiscover == nullptr) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to call discover-- Null FnPtr for Mapl[%d]", i);
            continue;
        }
        const SaErrorT rc = slot.ModuleInitTable->ResourcesDiscover(DomainId);
        if (rc != SA_OK)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Mapl[%d] Discover returned %d", i, rc);
    }
    MAPL_RELEASE_OR_DIE(KVI_CS_RW_LOCK_RD_UNLOCK, &MaplManagerRepository.MaplMasterLock,
                        KVI_LOG_ERR_FATAL, "Unable to unlock MaplMasterLock");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviDsMaplManagerGetMaplLock(SaHpiUint32T MaplNum, SaHpiUint32T LockNum,
                                                KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("MaplNum: %u, LockNum: %u", MaplNum, LockNum);
    KVI_NULL_CHECK(MaplLock);
    INIT_CHECK();
    // Getting the lock for writing at once means nobody holds it for reading:
    // the slot could be unloaded under the caller, who broke the protocol.
    if (KVI_CS_RW_LOCK_TRY_WR_LOCK(&MaplManagerRepository.MaplMasterLock) == SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "The caller to kviDsMaplManagerGetMaplLock did not perform "
                                       "a read lock on the MaplMasterLock");
        MAPL_RELEASE_OR_DIE(KVI_CS_RW_LOCK_WR_UNLOCK, &MaplManagerRepository.MaplMasterLock,
                            KVI_LOG_ERR_FATAL, "Unable to unlock MaplMasterLock");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    return lookUpLock(MaplNum, LockNum, MaplLock);
}

KVI_EXPORT SaErrorT kviDsMaplManagerUnprotectedGetMaplLock(SaHpiUint32T MaplNum,
                                                           SaHpiUint32T LockNum,
                                                           KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("MaplNum: %u, LockNum: %u", MaplNum, LockNum);
    KVI_NULL_CHECK(MaplLock);
    INIT_CHECK();
    return lookUpLock(MaplNum, LockNum, MaplLock);
}

KVI_EXPORT SaErrorT kviDsMaplManagerGetMaplName(SaHpiUint32T MaplNum, SaHpiUint32T BufferSize,
                                                SaHpiInt8T *Buffer) noexcept
{
    KVI_TRACE("MaplNum: %u", MaplNum);
    KVI_NULL_CHECK(Buffer);
    const SaErrorT locked =
        KVI_CS_RW_LOCK_RD_LOCK(&MaplManagerRepository.MaplMasterLock, MAPL_MASTER_LOCK_TIMEOUT);
    if (locked != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_RW_LOCK_RD_LOCK returned %d", locked);
        return SA_ERR_HPI_ERROR;
    }
    const SaErrorT rc = copyName(MaplNum, BufferSize, Buffer);
    MAPL_RELEASE_OR_DIE(KVI_CS_RW_LOCK_RD_UNLOCK, &MaplManagerRepository.MaplMasterLock,
                        KVI_LOG_ERR_NONFATAL, "Unable to free Mapl Master Lock");
    return rc;
}

} // extern "C"
