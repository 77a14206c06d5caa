// The RDR store: one repository of records per resource, filled by plug-ins
// while the resource is inactive and read by type and number to route the
// sensor, control, inventory and watchdog calls. Repository access runs
// under the RPT lock; only the size of new repositories has a lock of its own.
#include <climits>
#include <cstdlib>

#include "core/SaHpi/rdr/RdrHelpers.h"

namespace
{
// Waits on the hash-size semaphore give up after this long (milliseconds).
constexpr SaHpiUint32T HASH_SIZE_TIMEOUT = 5000;

SaHpiUint32T GlobalHashSize = KVI_CS_DEFAULT_RDR_HASH_SIZE;
KviCsSemaphore GlobalHashSizeSemaphore;
SaHpiBoolT GlobalHashSizeSemaphoreInitialized = SAHPI_FALSE;
SaHpiBoolT RdrInitialized = SAHPI_FALSE;

#define KVI_SITE_LOG(Site, LevelNum, ...)                                                          \
    kviCsLogger((Site).file, static_cast<SaHpiInt16T>((Site).line), (Site).func, (LevelNum),       \
                __VA_ARGS__)

#define RDR_INIT_CHECK()                                                                           \
    do {                                                                                           \
        if (!RdrInitialized) {                                                                     \
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Rdr not yet initialized");                             \
            return SA_ERR_HPI_INVALID_REQUEST;                                                     \
        }                                                                                          \
    } while (0)

// Runs Op with the hash-size semaphore held.
template <typename Op> SaErrorT withGlobalHashSize(Op op)
{
    if (!GlobalHashSizeSemaphoreInitialized) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "The RDR GlobalHashSizeSemaphore has not been initialized. ");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    SaErrorT rc = KVI_CS_SEM_WAIT(&GlobalHashSizeSemaphore, HASH_SIZE_TIMEOUT);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "SemWait failed!  rc=%d", rc);
        return rc;
    }
    op();
    rc = KVI_CS_SEM_POST(&GlobalHashSizeSemaphore);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "SemPost failed! rc=%d.  Bailing.", rc);
        exit(1);
    }
    return SA_OK;
}

// What a lookup of a missing resource reports: the add says the resource is
// not present, the readers that the client named an invalid resource.
enum class MissingResource { NotPresent, InvalidResource };

// The frame of every repository operation: the RPT locked and the resource's
// entry found, for the rest of the scope.
class RdrResourceScope
{
  public:
    RdrResourceScope(const KviCallSite &Site, SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                     MissingResource Missing) noexcept
        : lock_(DomainId)
    {
        rc_ = lock_.held() ? find(Site, ResourceId, Missing) : lockFailure(Site, lock_.result());
    }
    SaErrorT result() const noexcept { return rc_; }
    KviCsRptEntryContainerT *entry() const noexcept { return entry_; }
    KviCsRdrRepositoryContainerT *repository() const noexcept
    {
        return &entry_->RdrRepositoryContainer;
    }

  private:
    static SaErrorT lockFailure(const KviCallSite &Site, SaErrorT Rc) noexcept
    {
        if (Rc == SA_ERR_HPI_INVALID_DOMAIN) {
            KVI_SITE_LOG(Site, KVI_LOG_ERR_NONFATAL_NUM, "Invalid Domain");
            return Rc;
        }
        KVI_SITE_LOG(Site, KVI_LOG_ERR_NONFATAL_NUM, "Unable to lock RPT");
        return SA_ERR_HPI_ERROR;
    }

    SaErrorT find(const KviCallSite &Site, SaHpiResourceIdT ResourceId,
                  MissingResource Missing) noexcept
    {
        SaErrorT rc = kviCsRptGetRptEntryContainer(lock_.rpt(), ResourceId, &entry_);
        if (rc == SA_OK)
            return SA_OK;
        bool missing = rc == SA_ERR_HPI_NOT_PRESENT;
        if (Missing == MissingResource::NotPresent) {
            KVI_SITE_LOG(Site, KVI_LOG_ERR_NONFATAL_NUM,
                         "kviCsRptGetRptEntryContainer failed, returned %d", rc);
            return missing ? SA_ERR_HPI_NOT_PRESENT : SA_ERR_HPI_ERROR;
        }
        if (missing) {
            KVI_SITE_LOG(Site, KVI_LOG_DBG_H_NUM,
                         "kviCsRptGetRptEntryContainer didn't return container, returned %d", rc);
            return SA_ERR_HPI_INVALID_RESOURCE;
        }
        KVI_SITE_LOG(Site, KVI_LOG_ERR_NONFATAL_NUM,
                     "kviCsRptGetRptEntryContainer failed unexpectedly, returned %d", rc);
        return SA_ERR_HPI_ERROR;
    }

    KviRptLock lock_;
    KviCsRptEntryContainerT *entry_ = nullptr;
    SaErrorT rc_;
};

#define LOCK_RDR_RESOURCE(Scope, DomainId, ResourceId, Missing)                                    \
    RdrResourceScope Scope(KVI_CALL_SITE(""), (DomainId), (ResourceId), (Missing));                \
    if (Scope.result() != SA_OK)                                                                   \
    return Scope.result()

// Record ids are the entry ids clients hold on to; a repeated one would route
// a call to the wrong record, so running out of them ends the process.
SaHpiEntryIdT takeRecordId(KviCsRdrRepositoryContainerT *Repository)
{
    SaHpiEntryIdT id = Repository->NextRecordId++;
    if (Repository->NextRecordId == 0) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Record Id's have rolled over (more than 2^32 generated). "
                                    "Record Id's are no longer unique.  This is bad. ");
        exit(1);
    }
    return id;
}

bool isAddableRdrType(SaHpiUint32T RdrType)
{
    return RdrType == SAHPI_CTRL_RDR || RdrType == SAHPI_SENSOR_RDR ||
           RdrType == SAHPI_INVENTORY_RDR || RdrType == SAHPI_WATCHDOG_RDR;
}

// The number of every record is the low 8 bits of its record id, whatever
// the plug-in put there, so that number, entry id and lookup key agree.
void numberRecord(SaHpiRdrT *Rdr, SaHpiEntryIdT RecordId, KviCsRdrRecordNumT *RecordNum)
{
    auto number = static_cast<SaHpiUint8T>(RecordId & 0xFF);
    switch (kviRawEnum(Rdr->RdrType)) {
    case SAHPI_CTRL_RDR:
        Rdr->RdrTypeUnion.CtrlRec.Num = RecordNum->ControlNum = number;
        break;
    case SAHPI_SENSOR_RDR:
        Rdr->RdrTypeUnion.SensorRec.Num = RecordNum->SensorNum = number;
        break;
    case SAHPI_INVENTORY_RDR:
        Rdr->RdrTypeUnion.InventoryRec.EirId = RecordNum->EirNum = number;
        break;
    case SAHPI_WATCHDOG_RDR:
        Rdr->RdrTypeUnion.WatchdogRec.WatchdogNum = RecordNum->WatchdogNum = number;
        break;
    default:
        break;
    }
    Rdr->RecordId = RecordId;
}

SaErrorT fileNewRecord(KviCsRdrRepositoryContainerT *Repository, const SaHpiRdrT &Rdr,
                       const KviDsRdrFnTable &FnTable, void *UserDefined)
{
    KviCsLinkedListNodeT *node = nullptr;
    SaErrorT rc = kviCsLinkedListNodeMalloc(&node);
    if (rc == SA_ERR_HPI_OUT_OF_SPACE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsLinkedListNodeMalloc failed, Out of Space");
        return rc;
    }
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsLinkedListNodeMalloc failed, returned %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    auto *record = static_cast<KviCsRdrContainerT *>(KVI_CS_MALLOC(sizeof(KviCsRdrContainerT)));
    if (record == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Malloc failed");
        kviCsLinkedListNodeFree(node);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    record->Rdr = Rdr;
    record->FnTable = FnTable;
    record->UserDefined = UserDefined;
    node->Data = record;
    KviHashTable table = kviRdrTableOf(Repository);
    if (!table.usable() || kviCsLinkedListAddToTail(table.listOf(Rdr.RecordId), node) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Couldn't add node to linked list");
        KVI_CS_FREE(record);
        kviCsLinkedListNodeFree(node);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

bool supports(SaHpiCapabilitiesT Capabilities, SaHpiCapabilitiesT Needed, const char *Refusal)
{
    if ((Capabilities & Needed) != 0)
        return true;
    KVI_DLOG(KVI_LOG_DBG_H, "%s", Refusal);
    return false;
}

// A resource is only asked for records of a kind it declares.
bool hasRdrTypeCapablity(SaHpiCapabilitiesT Capabilities, SaHpiUint32T RdrType)
{
    switch (RdrType) {
    case SAHPI_NO_RECORD:
        return true;
    case SAHPI_CTRL_RDR:
        return supports(Capabilities, SAHPI_CAPABILITY_CONTROL,
                        "Resource does not support controls");
    case SAHPI_SENSOR_RDR:
        return supports(Capabilities, SAHPI_CAPABILITY_SENSOR, "Resource does not support sensors");
    case SAHPI_INVENTORY_RDR:
        return supports(Capabilities, SAHPI_CAPABILITY_INVENTORY_DATA,
                        "Resource does not support entity inventory");
    case SAHPI_WATCHDOG_RDR:
        return supports(Capabilities, SAHPI_CAPABILITY_WATCHDOG,
                        "Resource does not support watchdogs");
    default:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unknown RDR type (%d)", RdrType);
        return false;
    }
}

bool isCorrectRdrType(const SaHpiRdrT &Rdr, SaHpiUint32T RdrType)
{
    if (RdrType == SAHPI_NO_RECORD || kviRawEnum(Rdr.RdrType) == RdrType)
        return true;
    KVI_DLOG(KVI_LOG_DBG_H, "RDR entry type (%d) does not match requested type (%d)", Rdr.RdrType,
             RdrType);
    return false;
}

// The record a client names by entry id (SAHPI_FIRST_ENTRY: the first of the
// walk), if it is of the requested type.
SaErrorT findTypedRecord(KviCsRdrRepositoryContainerT *Repository, SaHpiEntryIdT EntryId,
                         SaHpiUint32T RdrType, KviCsRdrContainerT **Record)
{
    SaHpiEntryIdT id = EntryId;
    if (id == SAHPI_FIRST_ENTRY && kviCsRdrGetNextEntry(Repository, id, &id) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "No Entries found.");
        return SA_ERR_HPI_NOT_PRESENT;
    }
    if (kviCsRdrGetRdrContainer(Repository, id, Record) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "Rdr entry %u not found", id);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    if (!isCorrectRdrType((*Record)->Rdr, RdrType)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Rdr entry is not the correct type");
        return SA_ERR_HPI_NOT_PRESENT;
    }
    return SA_OK;
}

using KviDefaultNumberField = SaHpiUint8T KviCsRdrRepositoryContainerT::*;

// Records Number as the resource's default of a kind, if that record exists
// and is of that kind.
SaErrorT setDefaultNumber(const KviCallSite &Site, SaHpiDomainIdT DomainId,
                          SaHpiResourceIdT ResourceId, SaHpiUint8T Number, SaHpiRdrTypeT RdrType,
                          KviDefaultNumberField Field)
{
    RdrResourceScope scope(Site, DomainId, ResourceId, MissingResource::InvalidResource);
    if (scope.result() != SA_OK)
        return scope.result();
    KviCsRdrContainerT *record = nullptr;
    if (kviCsRdrGetRdrContainer(scope.repository(), Number, &record) != SA_OK ||
        record->Rdr.RdrType != RdrType) {
        KVI_SITE_LOG(Site, KVI_LOG_DBG_H_NUM, "No record %u of type %d", Number, RdrType);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    scope.repository()->*Field = Number;
    return SA_OK;
}

SaErrorT getDefaultNumber(const KviCallSite &Site, SaHpiDomainIdT DomainId,
                          SaHpiResourceIdT ResourceId, SaHpiUint8T *Number,
                          KviDefaultNumberField Field)
{
    RdrResourceScope scope(Site, DomainId, ResourceId, MissingResource::InvalidResource);
    if (scope.result() != SA_OK)
        return scope.result();
    *Number = scope.repository()->*Field;
    return SA_OK;
}

// Number 0 of the inventory and watchdog kinds names the resource's default.
template <typename DefaultGet>
SaErrorT resolveDefault(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiUint8T *Number,
                        DefaultGet Get)
{
    if (*Number != 0)
        return SA_OK;
    SaErrorT rc = Get(DomainId, ResourceId, Number);
    if (rc != SA_OK)
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "unexpected rc of %d", rc);
    return rc;
}

SaErrorT allocateLists(SaHpiUint32T Size, KviCsLinkedListT **Lists)
{
    // A size whose lists do not fit the allocator's request is refused as if
    // memory had run out.
    *Lists = Size > INT_MAX / sizeof(KviCsLinkedListT)
                 ? nullptr
                 : static_cast<KviCsLinkedListT *>(KVI_CS_MALLOC(Size * sizeof(KviCsLinkedListT)));
    if (*Lists == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to allocate memory for the RDR's linked list");
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    for (SaHpiUint32T i = 0; i < Size; ++i) {
        if (kviCsLinkedListInitialize(&(*Lists)[i]) != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unable to initalize Linkedlist.");
            KVI_CS_FREE(*Lists);
            return SA_ERR_HPI_ERROR;
        }
    }
    return SA_OK;
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsRdrInitializeGlobalHashSizeSemaphore(void) noexcept
{
    KVI_TRACE("");
    if (GlobalHashSizeSemaphoreInitialized)
        return SA_OK;
    if (KVI_CS_SEM_INIT(&GlobalHashSizeSemaphore, 1) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL,
                 "Unable to initialize the RDR GlobalHashSizeSemaphore.  Bailing");
        exit(1);
    }
    GlobalHashSizeSemaphoreInitialized = SAHPI_TRUE;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRdrInitialize(void) noexcept
{
    KVI_TRACE("");
    if (RdrInitialized) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRdrIniitalize called multiple times");
        return SA_ERR_HPI_DUPLICATE;
    }
    if (kviCsRdrInitializeGlobalHashSizeSemaphore() != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to initialize Rdr Global Hash Size Semaphore, bailing");
        exit(1);
    }
    RdrInitialized = SAHPI_TRUE;
    return SA_OK;
}

// Repositories made before a change keep the size they were made with.
KVI_EXPORT SaErrorT kviCsRdrHashSizeSet(SaHpiUint32T HashSize) noexcept
{
    KVI_TRACE("");
    if (HashSize == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Hash size can't be set to 0!");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return withGlobalHashSize([HashSize] { GlobalHashSize = HashSize; });
}

KVI_EXPORT SaErrorT kviCsRdrHashSizeGet(SaHpiUint32T *HashSize) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(HashSize);
    return withGlobalHashSize([HashSize] { *HashSize = GlobalHashSize; });
}

KVI_EXPORT SaErrorT
kviCsRdrRepositoryContainerInitialize(KviCsRdrRepositoryContainerT *RdrRepositoryContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RdrRepositoryContainer);
    SaHpiUint32T size = 0;
    if (kviCsRdrHashSizeGet(&size) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Unable to retrieve hash size, failing");
        return SA_ERR_HPI_ERROR;
    }
    if (size == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "hash size can't be zero!");
        return SA_ERR_HPI_ERROR;
    }
    RdrRepositoryContainer->HashSize = size;
    RdrRepositoryContainer->NextRecordId = 1;
    RdrRepositoryContainer->DefaultEirId = 0;
    RdrRepositoryContainer->DefaultWatchdogNum = 0;
    return allocateLists(size, &RdrRepositoryContainer->RdrList);
}

KVI_EXPORT SaErrorT
kviCsRdrRepositoryRemove(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                         KviCsRdrRepositoryContainerT *RdrRepositoryContainer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(RdrRepositoryContainer);
    while (kviHashFirstFrom(kviRdrTableOf(RdrRepositoryContainer), 0) != nullptr) {
        SaErrorT rc = kviCsRdrGivenRepositoryRemoveEntry(DomainId, ResourceId,
                                                         RdrRepositoryContainer, SAHPI_FIRST_ENTRY);
        if (rc == SA_ERR_HPI_NOT_PRESENT)
            break;
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRdrGivenRepositoryRemoveEntry returned %d.  ", rc);
            return rc;
        }
    }
    if (RdrRepositoryContainer->RdrList != nullptr)
        KVI_CS_FREE(RdrRepositoryContainer->RdrList);
    RdrRepositoryContainer->HashSize = 0;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRdrAdd(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiRdrT *RdrEntry, void *UserDefined, KviDsRdrFnTable *FnTable,
                                SaHpiEntryIdT *RecordId, KviCsRdrRecordNumT *RecordNum) noexcept
{
    KVI_TRACE("");
    RDR_INIT_CHECK();
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(RecordId);
    KVI_NULL_CHECK(RecordNum);
    KVI_NULL_CHECK(RdrEntry);
    LOCK_RDR_RESOURCE(scope, DomainId, ResourceId, MissingResource::NotPresent);
    if (scope.entry()->Active) {
        KVI_DLOG(KVI_LOG_DBG_H, "Can't add entries to active resources");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    // The id is spent from here on, whatever happens to the record.
    SaHpiEntryIdT id = takeRecordId(scope.repository());
    if (!isAddableRdrType(kviRawEnum(RdrEntry->RdrType))) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "RdrType is invalid (%d)", kviRawEnum(RdrEntry->RdrType));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    numberRecord(RdrEntry, id, RecordNum);
    *RecordId = id;
    SaErrorT rc = fileNewRecord(scope.repository(), *RdrEntry, *FnTable, UserDefined);
    if (rc == SA_OK)
        trace.exitMessage("Success");
    return rc;
}

KVI_EXPORT SaErrorT kviCsRdrGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiRdrTypeT RdrType, SaHpiEntryIdT EntryId,
                                SaHpiEntryIdT *NextEntryId, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                void **UserDefined, KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                                KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("");
    RDR_INIT_CHECK();
    KVI_NULL_CHECK(Active);
    LOCK_RDR_RESOURCE(scope, DomainId, ResourceId, MissingResource::InvalidResource);
    const KviCsRptEntryContainerT *entry = scope.entry();
    // A C caller may pass any int as the type.
    SaHpiUint32T type = kviRawEnum(RdrType);
    if (!hasRdrTypeCapablity(entry->RptEntry.ResourceCapabilities, type))
        return SA_ERR_HPI_INVALID_CMD;
    KviCsRdrContainerT *record = nullptr;
    SaErrorT rc = findTypedRecord(scope.repository(), EntryId, type, &record);
    if (rc != SA_OK)
        return rc;
    // The next id is that of the next record of any type.
    if (NextEntryId != nullptr &&
        kviCsRdrGetNextEntry(scope.repository(), record->Rdr.RecordId, NextEntryId) != SA_OK)
        return SA_ERR_HPI_ERROR;
    if (Rdr != nullptr)
        *Rdr = record->Rdr;
    *Active = entry->Active;
    if (UserDefined != nullptr)
        *UserDefined = record->UserDefined;
    if (FnTable != nullptr)
        *FnTable = record->FnTable;
    if (MaplNum != nullptr)
        *MaplNum = entry->MaplNum;
    if (MaplLock != nullptr)
        *MaplLock = entry->MaplLock;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRdrGetSensor(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                      void **UserDefined, KviDsRdrFnTable *FnTable,
                                      SaHpiUint32T *MaplNum, KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("");
    return kviCsRdrGet(DomainId, ResourceId, SAHPI_SENSOR_RDR, SensorNum, nullptr, Rdr, Active,
                       UserDefined, FnTable, MaplNum, MaplLock);
}

KVI_EXPORT SaErrorT kviCsRdrGetControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiCtrlNumT CtrlNum, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                       void **UserDefined, KviDsRdrFnTable *FnTable,
                                       SaHpiUint32T *MaplNum, KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("");
    return kviCsRdrGet(DomainId, ResourceId, SAHPI_CTRL_RDR, CtrlNum, nullptr, Rdr, Active,
                       UserDefined, FnTable, MaplNum, MaplLock);
}

KVI_EXPORT SaErrorT kviCsRdrGetEir(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiEirIdT EirNum, SaHpiRdrT *Rdr, SaHpiBoolT *Active,
                                   void **UserDefined, KviDsRdrFnTable *FnTable,
                                   SaHpiUint32T *MaplNum, KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("");
    SaErrorT rc = resolveDefault(DomainId, ResourceId, &EirNum, kviCsDefaultEirGet);
    if (rc != SA_OK)
        return rc;
    return kviCsRdrGet(DomainId, ResourceId, SAHPI_INVENTORY_RDR, EirNum, nullptr, Rdr, Active,
                       UserDefined, FnTable, MaplNum, MaplLock);
}

KVI_EXPORT SaErrorT kviCsRdrGetWatchdog(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiWatchdogNumT WatchdogNum, SaHpiRdrT *Rdr,
                                        SaHpiBoolT *Active, void **UserDefined,
                                        KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                                        KviCsRwLockT **MaplLock) noexcept
{
    KVI_TRACE("");
    SaErrorT rc = resolveDefault(DomainId, ResourceId, &WatchdogNum, kviCsDefaultWatchdogGet);
    if (rc != SA_OK)
        return rc;
    return kviCsRdrGet(DomainId, ResourceId, SAHPI_WATCHDOG_RDR, WatchdogNum, nullptr, Rdr, Active,
                       UserDefined, FnTable, MaplNum, MaplLock);
}

KVI_EXPORT SaErrorT kviCsDefaultEirSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiEirIdT EirId) noexcept
{
    KVI_TRACE("");
    RDR_INIT_CHECK();
    return setDefaultNumber(KVI_CALL_SITE(""), DomainId, ResourceId, EirId, SAHPI_INVENTORY_RDR,
                            &KviCsRdrRepositoryContainerT::DefaultEirId);
}

KVI_EXPORT SaErrorT kviCsDefaultEirGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiEirIdT *EirId) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(EirId);
    RDR_INIT_CHECK();
    return getDefaultNumber(KVI_CALL_SITE(""), DomainId, ResourceId, EirId,
                            &KviCsRdrRepositoryContainerT::DefaultEirId);
}

KVI_EXPORT SaErrorT kviCsDefaultWatchdogSet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            SaHpiWatchdogNumT WatchdogNum) noexcept
{
    KVI_TRACE("");
    RDR_INIT_CHECK();
    return setDefaultNumber(KVI_CALL_SITE(""), DomainId, ResourceId, WatchdogNum,
                            SAHPI_WATCHDOG_RDR, &KviCsRdrRepositoryContainerT::DefaultWatchdogNum);
}

KVI_EXPORT SaErrorT kviCsDefaultWatchdogGet(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            SaHpiWatchdogNumT *WatchdogNum) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(WatchdogNum);
    RDR_INIT_CHECK();
    return getDefaultNumber(KVI_CALL_SITE(""), DomainId, ResourceId, WatchdogNum,
                            &KviCsRdrRepositoryContainerT::DefaultWatchdogNum);
}

} // extern "C"
