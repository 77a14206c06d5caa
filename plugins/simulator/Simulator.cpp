// The simulator plug-in: a small shelf (a chassis, processor boards, fan trays
// and power supplies) that answers every HPI call of the library without
// hardware. This file holds what is plug-in wide: the exported
// initialisation table, the configuration, the registry of resources,
// discovery, the watchdog countdown thread and the two function tables.
#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <ctime>

#include "SimModel.h"

namespace
{

// Configuration keys of the simulator's own, with their defaults and bounds.
struct SimSizeKeyT {
    const char *Key;
    SaHpiUint32T Default;
    SaHpiUint32T Min;
    SaHpiUint32T Max;
};

enum {
    SIM_KEY_BOARDS,
    SIM_KEY_FAN_TRAYS,
    SIM_KEY_FANS,
    SIM_KEY_SUPPLIES,
    SIM_KEY_LOG_SIZE,
    SIM_KEY_COUNT
};

// Fans are records of their tray, and a resource's record numbers are 8 bits
// wide, so a tray keeps well below 255 records.
constexpr SimSizeKeyT SizeKeys[SIM_KEY_COUNT] = {
    {"KviSimProcessorBoards", 1, 0, 4096},
    {"KviSimFanTrays", 1, 0, 1024},
    {"KviSimFans", 2, 1, 32},
    {"KviSimPowerSupplies", 1, 0, 1024},
    {"KviSimEventLogSize", SIM_SEL_DEFAULT_SIZE, 1, 4096},
};

// Plug-in wide state. Registry guards the table of resources; a resource's
// own mutex guards its state. Order: Registry before any resource mutex.
pthread_mutex_t Registry = PTHREAD_MUTEX_INITIALIZER;
SaHpiBoolT Initialized = SAHPI_FALSE;
SaHpiBoolT Discovered = SAHPI_FALSE;
SaHpiUint32T MaplNum = 0;
SaHpiUint32T Sizes[SIM_KEY_COUNT];
SimResourceT **Resources = nullptr;
SaHpiUint32T ResourceCount = 0;
SaHpiUint32T ResourceCapacity = 0;
// Hot swap: one flag per FRU place of the shelf (in the block of Resources),
// true while a board sits there; the boards pulled since initialization,
// kept because a client call may still hold their pointer.
SaHpiBoolT *Present = nullptr;
SimResourceT *DepartedList = nullptr;
SaHpiDomainIdT ShelfDomain = SAHPI_DEFAULT_DOMAIN_ID;
SaHpiUint32T LockCount = 0;

// The hot-swap clock; a test that takes it over moves it by hand.
pthread_mutex_t ClockMutex = PTHREAD_MUTEX_INITIALIZER;
SaHpiBoolT ManualClock = SAHPI_FALSE;
SaHpiInt64T ManualNowNs = 0;

// The countdown thread wakes every tick while a watchdog runs and otherwise
// sleeps until one starts or the plug-in is finalized.
constexpr SaHpiUint32T SIM_TICK_MS = 10;
pthread_mutex_t TickMutex = PTHREAD_MUTEX_INITIALIZER;
pthread_cond_t TickCond;
SaHpiBoolT TickCondReady = SAHPI_FALSE;
SaHpiBoolT TickStop = SAHPI_FALSE;
SaHpiBoolT TickWake = SAHPI_FALSE;
SaHpiBoolT ThreadRunning = SAHPI_FALSE;
pthread_t Thread;

SaHpiUint32T readSize(const SimSizeKeyT &Key) noexcept
{
    SaHpiUint32T value = 0;
    SaErrorT rc = kviCsCfgDataUint32Get(Key.Key, &value, NULL);
    if (rc == SA_ERR_HPI_NOT_PRESENT) {
        return Key.Default;
    }
    if (rc != SA_OK || value < Key.Min || value > Key.Max) {
        KVI_WLOG(KVI_LOG_WARN, "Simulator: invalid %s (rc=%d), using %u", Key.Key, rc, Key.Default);
        return Key.Default;
    }
    return value;
}

SaHpiInt64T monotonicNs() noexcept
{
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<SaHpiInt64T>(now.tv_sec) * 1000000000 + now.tv_nsec;
}

SaHpiUint32T countOf(SimKindT Kind) noexcept
{
    const SaHpiUint32T counts[SIM_KIND_COUNT] = {1, Sizes[SIM_KEY_BOARDS], Sizes[SIM_KEY_FAN_TRAYS],
                                                 Sizes[SIM_KEY_SUPPLIES]};
    return counts[Kind];
}

// The place of a resource of the shelf in Present: kinds in order, then
// instances.
SaHpiUint32T placeOf(SimKindT Kind, SaHpiUint32T Instance) noexcept
{
    SaHpiUint32T place = Instance - 1;
    for (SaHpiUint32T kind = 0; kind < Kind; kind++) {
        place += countOf(static_cast<SimKindT>(kind));
    }
    return place;
}

SaHpiUint32T placeOf(const SimResourceT *Resource) noexcept
{
    return placeOf(Resource->Shape->Kind, Resource->Instance);
}

// Takes a resource out of the table of resources; Registry held.
SaHpiBoolT takeOut(SimResourceT *Resource) noexcept
{
    for (SaHpiUint32T i = 0; i < ResourceCount; i++) {
        if (Resources[i] == Resource) {
            Resources[i] = Resources[--ResourceCount];
            return SAHPI_TRUE;
        }
    }
    return SAHPI_FALSE;
}

// A board that reached NOT_PRESENT leaves the registry for the departed
// chain, then the RPT, whose removal slot leaves it there.
void departResource(SimResourceT *Resource) noexcept
{
    pthread_mutex_lock(&Registry);
    const SaHpiBoolT mine = takeOut(Resource);
    if (mine) {
        Resource->Departed = SAHPI_TRUE;
        Resource->NextDeparted = DepartedList;
        DepartedList = Resource;
        Present[placeOf(Resource)] = SAHPI_FALSE;
    }
    pthread_mutex_unlock(&Registry);
    if (!mine) {
        return; // another thread took it out
    }
    SaErrorT rc = kviCsRptEntryRemoveByRid(Resource->DomainId, Resource->ResourceId);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: removing rid=%u failed. rc=%d",
                 Resource->ResourceId, rc);
    }
}

// Runs the hot-swap countdowns that are due, taking out the boards that
// left; returns whether a countdown still runs.
SaHpiBoolT hotSwapTick() noexcept
{
    const SaHpiInt64T now = simHotSwapNowNs();
    for (;;) {
        SaHpiBoolT counting = SAHPI_FALSE;
        SimResourceT *gone = nullptr;
        pthread_mutex_lock(&Registry);
        for (SaHpiUint32T i = 0; i < ResourceCount && gone == nullptr; i++) {
            SimLock lock(Resources[i]);
            if (simHotSwapTick(Resources[i], now)) {
                counting = SAHPI_TRUE;
            }
            if (Resources[i]->HotSwap.Departing) {
                gone = Resources[i];
            }
        }
        pthread_mutex_unlock(&Registry);
        if (gone == nullptr) {
            return counting;
        }
        departResource(gone);
    }
}

void wakeTicker() noexcept
{
    pthread_mutex_lock(&TickMutex);
    TickWake = SAHPI_TRUE;
    pthread_cond_signal(&TickCond);
    pthread_mutex_unlock(&TickMutex);
}

void *tickerMain(void *) noexcept
{
    pthread_mutex_lock(&TickMutex);
    SaHpiBoolT anyRunning = SAHPI_FALSE;
    while (!TickStop) {
        if (anyRunning) {
            struct timespec until;
            clock_gettime(CLOCK_MONOTONIC, &until);
            until.tv_nsec += SIM_TICK_MS * 1000000L;
            if (until.tv_nsec >= 1000000000L) {
                until.tv_sec += 1;
                until.tv_nsec -= 1000000000L;
            }
            while (!TickStop && !TickWake &&
                   pthread_cond_timedwait(&TickCond, &TickMutex, &until) != ETIMEDOUT) {
            }
        } else {
            while (!TickStop && !TickWake) {
                pthread_cond_wait(&TickCond, &TickMutex);
            }
        }
        TickWake = SAHPI_FALSE;
        if (TickStop) {
            break;
        }
        pthread_mutex_unlock(&TickMutex);

        anyRunning = SAHPI_FALSE;
        SaHpiInt64T now = simMonotonicMs();
        pthread_mutex_lock(&Registry);
        for (SaHpiUint32T i = 0; i < ResourceCount; i++) {
            SimLock lock(Resources[i]);
            if (simWatchdogTick(Resources[i], now)) {
                anyRunning = SAHPI_TRUE;
            }
        }
        pthread_mutex_unlock(&Registry);
        if (hotSwapTick()) {
            anyRunning = SAHPI_TRUE;
        }

        pthread_mutex_lock(&TickMutex);
    }
    pthread_mutex_unlock(&TickMutex);
    return nullptr;
}

SaErrorT startTicker() noexcept
{
    if (!TickCondReady) {
        pthread_condattr_t attr;
        pthread_condattr_init(&attr);
        pthread_condattr_setclock(&attr, CLOCK_MONOTONIC);
        int rc = pthread_cond_init(&TickCond, &attr);
        pthread_condattr_destroy(&attr);
        if (rc != 0) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: pthread_cond_init failed (%d)", rc);
            return SA_ERR_HPI_ERROR;
        }
        TickCondReady = SAHPI_TRUE;
    }
    TickStop = SAHPI_FALSE;
    TickWake = SAHPI_FALSE;
    int rc = pthread_create(&Thread, nullptr, tickerMain, nullptr);
    if (rc != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: unable to start the watchdog thread (%d)", rc);
        return SA_ERR_HPI_ERROR;
    }
    ThreadRunning = SAHPI_TRUE;
    return SA_OK;
}

void stopTicker() noexcept
{
    if (!ThreadRunning) {
        return;
    }
    pthread_mutex_lock(&TickMutex);
    TickStop = SAHPI_TRUE;
    pthread_cond_signal(&TickCond);
    pthread_mutex_unlock(&TickMutex);
    pthread_join(Thread, nullptr);
    ThreadRunning = SAHPI_FALSE;
    // The condition lives in this library's data, which dlclose unmaps.
    pthread_cond_destroy(&TickCond);
    TickCondReady = SAHPI_FALSE;
}

// Frees a resource and whatever hangs on its records. The caller has taken it
// out of the registry, so no other thread can reach it.
void releaseResource(SimResourceT *Resource) noexcept
{
    for (SaHpiUint32T i = 0; i < Resource->RecordCount; i++) {
        if (Resource->Records[i].Type == SAHPI_INVENTORY_RDR) {
            simInventoryRelease(&Resource->Records[i]);
        }
    }
    simEventLogRelease(&Resource->Log);
    pthread_mutex_destroy(&Resource->Mutex);
    KVI_CS_FREE(Resource);
}

SaHpiBoolT unregisterResource(SimResourceT *Resource) noexcept
{
    pthread_mutex_lock(&Registry);
    SaHpiBoolT found = takeOut(Resource);
    pthread_mutex_unlock(&Registry);
    return found;
}

SaHpiUint32T fansOf(SimKindT Kind) noexcept
{
    return Kind == SIM_FAN_TRAY ? Sizes[SIM_KEY_FANS] : 1;
}

// One block holds the resource and its records, so a resource is one
// allocation of the library's allocator and one free.
SimResourceT *allocateResource(const SimResourceShapeT *Shape, SaHpiUint32T Instance) noexcept
{
    SaHpiUint32T records = 0;
    for (SaHpiUint32T i = 0; i < Shape->RecordCount; i++) {
        records += Shape->Records[i].PerFan ? fansOf(Shape->Kind) : 1;
    }
    size_t head = (sizeof(SimResourceT) + alignof(SimRecordT) - 1) / alignof(SimRecordT) *
                  alignof(SimRecordT);
    size_t size = head + records * sizeof(SimRecordT);
    auto *resource = static_cast<SimResourceT *>(KVI_CS_MALLOC(size));
    if (resource == nullptr) {
        return nullptr;
    }
    memset(static_cast<void *>(resource), 0, size);
    pthread_mutex_init(&resource->Mutex, nullptr);
    resource->Shape = Shape;
    resource->Instance = Instance;
    resource->RecordCount = records;
    resource->Records = reinterpret_cast<SimRecordT *>(reinterpret_cast<char *>(resource) + head);
    resource->Log.Size = Sizes[SIM_KEY_LOG_SIZE];
    simResourceInitialize(resource);

    SimRecordT *record = resource->Records;
    for (SaHpiUint32T i = 0; i < Shape->RecordCount; i++) {
        const SimRecordShapeT &rs = Shape->Records[i];
        SaHpiUint32T repeat = rs.PerFan ? fansOf(Shape->Kind) : 1;
        for (SaHpiUint32T fan = 1; fan <= repeat; fan++, record++) {
            record->Resource = resource;
            record->Type = rs.Type;
            record->Fan = static_cast<SaHpiUint8T>(rs.PerFan ? fan : 0);
            switch (rs.Type) {
            case SAHPI_SENSOR_RDR:
                record->Sensor.Shape = static_cast<const SimSensorShapeT *>(rs.Shape);
                simSensorInitialize(record);
                break;
            case SAHPI_CTRL_RDR:
                record->Control.Shape = static_cast<const SimControlShapeT *>(rs.Shape);
                simControlInitialize(record);
                break;
            case SAHPI_INVENTORY_RDR:
                if (simInventoryInitialize(record) != SA_OK) {
                    releaseResource(resource);
                    return nullptr;
                }
                break;
            case SAHPI_WATCHDOG_RDR:
                simWatchdogInitialize(record);
                break;
            default:
                break;
            }
        }
    }
    simSensorsEvaluate(resource);
    return resource;
}

void entityPath(SimKindT Kind, SaHpiUint32T Instance, SaHpiEntityPathT *Path) noexcept
{
    memset(Path, 0, sizeof(*Path));
    SaHpiUint32T n = 0;
    if (Kind != SIM_CHASSIS) {
        Path->Entry[n].EntityType = simResourceShape(Kind)->Entity;
        Path->Entry[n].EntityInstance = Instance;
        n++;
    }
    Path->Entry[n].EntityType = SAHPI_ENT_SYSTEM_CHASSIS;
    Path->Entry[n].EntityInstance = 1;
    n++;
    Path->Entry[n].EntityType = SAHPI_ENT_ROOT;
    Path->Entry[n].EntityInstance = 0;
}

void buildRptEntry(const SimResourceT *Resource, SaHpiDomainIdT DomainId,
                   SaHpiRptEntryT *Entry) noexcept
{
    memset(Entry, 0, sizeof(*Entry));
    const SimResourceShapeT *shape = Resource->Shape;
    Entry->ResourceInfo.ResourceRev = 1;
    Entry->ResourceInfo.SpecificVer = 1;
    Entry->ResourceInfo.ManufacturerId = SIM_MANUFACTURER_ID;
    Entry->ResourceInfo.ProductId = static_cast<SaHpiUint16T>(0x5100 + shape->Kind);
    Entry->ResourceInfo.FirmwareMajorRev = 1;
    Entry->ResourceInfo.FirmwareMinorRev = 0;
    entityPath(shape->Kind, Resource->Instance, &Entry->ResourceEntity);
    Entry->ResourceCapabilities = shape->Capabilities;
    Entry->ResourceSeverity = shape->Severity;
    Entry->DomainId = DomainId;
    char tag[SAHPI_MAX_TEXT_BUFFER_LENGTH + 1];
    snprintf(tag, sizeof(tag), shape->TagFormat, Resource->Instance);
    simText(&Entry->ResourceTag, tag);
}

void buildRdr(const SimRecordT *Record, SaHpiRdrT *Rdr) noexcept
{
    memset(Rdr, 0, sizeof(*Rdr));
    Rdr->RdrType = Record->Type;
    entityPath(Record->Resource->Shape->Kind, Record->Resource->Instance, &Rdr->Entity);
    char id[SAHPI_MAX_TEXT_BUFFER_LENGTH + 1] = "";
    switch (Record->Type) {
    case SAHPI_SENSOR_RDR:
        simSensorRecord(Record, &Rdr->RdrTypeUnion.SensorRec);
        snprintf(id, sizeof(id), Record->Sensor.Shape->IdString, Record->Fan);
        break;
    case SAHPI_CTRL_RDR:
        simControlRecord(Record, &Rdr->RdrTypeUnion.CtrlRec);
        snprintf(id, sizeof(id), "%s", Record->Control.Shape->IdString);
        break;
    case SAHPI_INVENTORY_RDR:
        snprintf(id, sizeof(id), "Inventory");
        break;
    case SAHPI_WATCHDOG_RDR:
        snprintf(id, sizeof(id), "Watchdog");
        break;
    default:
        break;
    }
    simText(&Rdr->IdString, id);
}

// Registers one resource: added inactive, given its records, then made
// active, so that no client sees it half built.
SaErrorT registerResource(SaHpiDomainIdT DomainId, SimResourceT *Resource,
                          KviCsRwLockT *Lock) noexcept
{
    SaHpiRptEntryT entry;
    buildRptEntry(Resource, DomainId, &entry);
    Resource->DomainId = DomainId;

    // The registry owns the resource from here on; the removal slot takes it
    // out again, whoever removes the RPT entry.
    pthread_mutex_lock(&Registry);
    if (ResourceCount == ResourceCapacity) {
        pthread_mutex_unlock(&Registry);
        releaseResource(Resource);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    Resources[ResourceCount++] = Resource;
    pthread_mutex_unlock(&Registry);

    SaHpiResourceIdT rid = 0;
    SaErrorT rc = kviCsRptEntryAdd(DomainId, entry, Resource, SAHPI_FALSE, &simRptFnTable, MaplNum,
                                   Lock, &rid);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: kviCsRptEntryAdd failed. rc=%d", rc);
        if (unregisterResource(Resource)) {
            releaseResource(Resource);
        }
        return rc;
    }
    {
        SimLock lock(Resource);
        Resource->ResourceId = rid;
    }
    // The entry id of an RPT entry is its resource id, which the table gives
    // out only now: rewrite the entry while it is still inactive.
    rc = kviCsRptEntryModifyByRid(DomainId, rid, entry, nullptr);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: kviCsRptEntryModifyByRid failed. rc=%d, rid=%u",
                 rc, rid);
    }

    for (SaHpiUint32T i = 0; i < Resource->RecordCount && rc == SA_OK; i++) {
        SimRecordT *record = &Resource->Records[i];
        SaHpiRdrT rdr;
        buildRdr(record, &rdr);
        SaHpiEntryIdT recordId = 0;
        KviCsRdrRecordNumT num;
        rc = kviCsRdrAdd(DomainId, rid, &rdr, record, &simRdrFnTables[record->Type], &recordId,
                         &num);
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: kviCsRdrAdd failed. rc=%d, rid=%u", rc, rid);
            break;
        }
        {
            SimLock lock(Resource);
            record->Num = num.SensorNum;
        }
        // Clients asking for the default watchdog or inventory get ours.
        if (record->Type == SAHPI_WATCHDOG_RDR) {
            kviCsDefaultWatchdogSet(DomainId, rid, num.WatchdogNum);
        } else if (record->Type == SAHPI_INVENTORY_RDR) {
            kviCsDefaultEirSet(DomainId, rid, num.EirNum);
        }
    }
    if (rc == SA_OK) {
        rc = kviCsRptEntryActiveStateSetByRid(DomainId, rid, SAHPI_TRUE);
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: activating rid=%u failed. rc=%d", rid, rc);
        }
    }
    if (rc != SA_OK) {
        // Removal calls our removal slot, which frees the resource.
        kviCsRptEntryRemoveByRid(DomainId, rid);
    }
    return rc;
}

void markPresent(SimKindT Kind, SaHpiUint32T Instance, SaHpiBoolT IsPresent) noexcept
{
    pthread_mutex_lock(&Registry);
    Present[placeOf(Kind, Instance)] = IsPresent;
    pthread_mutex_unlock(&Registry);
}

// The plug-in's locks, handed out round robin over the resources.
SaHpiUint32T countLocks() noexcept
{
    SaHpiUint32T n = 0;
    KviCsRwLockT *lock = nullptr;
    while (n < 4096 && kviDsMaplManagerGetMaplLock(MaplNum, n, &lock) == SA_OK) {
        n++;
    }
    return n;
}

SaErrorT simGetVersion(SaHpiVersionT *Version) noexcept
{
    if (Version == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    *Version = KVI_MAPL_INTR_VERSION;
    return SA_OK;
}

SaErrorT simMaplInitialization(SaHpiUint32T Num) noexcept
{
    pthread_mutex_lock(&Registry);
    if (Initialized) {
        pthread_mutex_unlock(&Registry);
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: initialized twice");
        return SA_ERR_HPI_DUPLICATE;
    }
    MaplNum = Num;
    for (SaHpiUint32T i = 0; i < SIM_KEY_COUNT; i++) {
        Sizes[i] = readSize(SizeKeys[i]);
    }
    ResourceCapacity =
        1 + Sizes[SIM_KEY_BOARDS] + Sizes[SIM_KEY_FAN_TRAYS] + Sizes[SIM_KEY_SUPPLIES];
    Resources = static_cast<SimResourceT **>(
        KVI_CS_MALLOC(ResourceCapacity * (sizeof(SimResourceT *) + sizeof(SaHpiBoolT))));
    if (Resources == nullptr) {
        pthread_mutex_unlock(&Registry);
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: out of memory");
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    ResourceCount = 0;
    Present = reinterpret_cast<SaHpiBoolT *>(Resources + ResourceCapacity);
    memset(Present, 0, ResourceCapacity * sizeof(SaHpiBoolT));
    Discovered = SAHPI_FALSE;
    SaErrorT rc = startTicker();
    if (rc != SA_OK) {
        KVI_CS_FREE(Resources);
        pthread_mutex_unlock(&Registry);
        return rc;
    }
    Initialized = SAHPI_TRUE;
    pthread_mutex_unlock(&Registry);
    KVI_ILOG(KVI_LOG_INFO,
             "Simulator: %u processor boards, %u fan trays of %u fans, %u power supplies",
             Sizes[SIM_KEY_BOARDS], Sizes[SIM_KEY_FAN_TRAYS], Sizes[SIM_KEY_FANS],
             Sizes[SIM_KEY_SUPPLIES]);
    return SA_OK;
}

SaErrorT simMaplFinalization(void) noexcept
{
    stopTicker();
    pthread_mutex_lock(&Registry);
    // The library removed our RPT entries before this call; anything left
    // never made it into the table.
    while (ResourceCount > 0) {
        releaseResource(Resources[--ResourceCount]);
    }
    while (DepartedList != nullptr) {
        SimResourceT *departed = DepartedList;
        DepartedList = departed->NextDeparted;
        releaseResource(departed);
    }
    if (Resources != nullptr) {
        KVI_CS_FREE(Resources);
    }
    ResourceCapacity = 0;
    Initialized = SAHPI_FALSE;
    Discovered = SAHPI_FALSE;
    pthread_mutex_unlock(&Registry);
    pthread_mutex_lock(&ClockMutex);
    ManualClock = SAHPI_FALSE;
    pthread_mutex_unlock(&ClockMutex);
    return SA_OK;
}

SaErrorT simResourcesDiscover(SaHpiDomainIdT DomainId) noexcept
{
    pthread_mutex_lock(&Registry);
    SaHpiBoolT ready = Initialized && !Discovered;
    Discovered = SAHPI_TRUE;
    pthread_mutex_unlock(&Registry);
    if (!ready) {
        // The shelf is fixed: later passes find nothing new.
        return Initialized ? SA_OK : SA_ERR_HPI_INVALID_REQUEST;
    }
    SaHpiUint32T locks = countLocks();
    if (locks == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: no plug-in lock available");
        return SA_ERR_HPI_ERROR;
    }
    pthread_mutex_lock(&Registry);
    ShelfDomain = DomainId;
    LockCount = locks;
    pthread_mutex_unlock(&Registry);
    SaErrorT result = SA_OK;
    SaHpiUint32T added = 0;
    for (SaHpiUint32T kind = 0; kind < SIM_KIND_COUNT; kind++) {
        const SimResourceShapeT *shape = simResourceShape(static_cast<SimKindT>(kind));
        for (SaHpiUint32T instance = 1; instance <= countOf(static_cast<SimKindT>(kind));
             instance++) {
            KviCsRwLockT *lock = nullptr;
            SaErrorT rc = kviDsMaplManagerGetMaplLock(MaplNum, added % locks, &lock);
            SimResourceT *resource = nullptr;
            if (rc == SA_OK) {
                resource = allocateResource(shape, instance);
                rc = resource == nullptr ? SA_ERR_HPI_OUT_OF_SPACE
                                         : registerResource(DomainId, resource, lock);
            }
            markPresent(static_cast<SimKindT>(kind), instance, rc == SA_OK);
            if (rc != SA_OK) {
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: resource %s %u not added. rc=%d",
                         shape->TagFormat, instance, rc);
                result = rc;
                continue;
            }
            added++;
        }
    }
    KVI_ILOG(KVI_LOG_INFO, "Simulator: %u resources discovered", added);
    return result;
}

// ---- Removal slots: the library calls them when it drops our entries ----

SaErrorT simRdrResourcesRemove(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRdrT *, void *UserData,
                               KviDsRdrFnTable *) noexcept
{
    auto *record = static_cast<SimRecordT *>(UserData);
    if (record == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimLock lock(record->Resource);
    if (record->Type == SAHPI_WATCHDOG_RDR) {
        simWatchdogStop(record);
    }
    record->Removed = SAHPI_TRUE;
    return SA_OK;
}

SaErrorT simRptEntryResourcesRemove(SaHpiDomainIdT, SaHpiResourceIdT, SaHpiRptEntryT *,
                                    void *UserDefined, SaHpiBoolT, KviDsRptFnTable *) noexcept
{
    auto *resource = static_cast<SimResourceT *>(UserDefined);
    if (resource == nullptr) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    pthread_mutex_lock(&Registry);
    const SaHpiBoolT departed = resource->Departed;
    const SaHpiBoolT found = !departed && takeOut(resource);
    pthread_mutex_unlock(&Registry);
    if (departed) {
        return SA_OK; // a pulled board stays on the departed chain
    }
    if (!found) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Simulator: removal of an unknown resource");
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    releaseResource(resource);
    return SA_OK;
}

} // namespace

// ---- Services of this file to the others ----

SimLock::SimLock(SimResourceT *Resource) noexcept : mutex_(&Resource->Mutex)
{
    pthread_mutex_lock(mutex_);
}

SimLock::~SimLock()
{
    pthread_mutex_unlock(mutex_);
}

SimResourceT *simFindResource(SaHpiResourceIdT ResourceId) noexcept
{
    pthread_mutex_lock(&Registry);
    SimResourceT *found = nullptr;
    for (SaHpiUint32T i = 0; i < ResourceCount; i++) {
        if (Resources[i]->ResourceId == ResourceId) {
            found = Resources[i];
            break;
        }
    }
    pthread_mutex_unlock(&Registry);
    return found;
}

SaHpiInt64T simMonotonicMs() noexcept
{
    struct timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<SaHpiInt64T>(now.tv_sec) * 1000 + now.tv_nsec / 1000000;
}

SaHpiTimeT simNow() noexcept
{
    SaHpiTimeT now = SAHPI_TIME_UNSPECIFIED;
    if (kviCsGetSaHpiTime(&now) != SA_OK) {
        return SAHPI_TIME_UNSPECIFIED;
    }
    return now;
}

void simCountdownStarted() noexcept
{
    wakeTicker();
}

SaHpiInt64T simHotSwapNowNs() noexcept
{
    pthread_mutex_lock(&ClockMutex);
    const SaHpiInt64T now = ManualClock ? ManualNowNs : monotonicNs();
    pthread_mutex_unlock(&ClockMutex);
    return now;
}

void simDepartIfDue(SimResourceT *Resource) noexcept
{
    SaHpiBoolT due = SAHPI_FALSE;
    {
        SimLock lock(Resource);
        due = Resource->HotSwap.Departing;
    }
    if (due) {
        departResource(Resource);
    }
}

void simText(SaHpiTextBufferT *Buffer, const char *Text) noexcept
{
    memset(Buffer, 0, sizeof(*Buffer));
    Buffer->DataType = SAHPI_TL_TYPE_LANGUAGE;
    Buffer->Language = SAHPI_LANG_ENGLISH;
    size_t n = strlen(Text);
    if (n > SAHPI_MAX_TEXT_BUFFER_LENGTH) {
        n = SAHPI_MAX_TEXT_BUFFER_LENGTH;
    }
    memcpy(Buffer->Data, Text, n);
    Buffer->DataLength = static_cast<SaHpiUint8T>(n);
}

// ---- Pulling and inserting boards, and the hot-swap clock (KviSimulator.h) ----

namespace
{

// The FRU place an entity path names; Registry held. The chassis is no FRU.
SaErrorT findFru(const SaHpiEntityPathT *Entity, SimKindT *Kind, SaHpiUint32T *Instance) noexcept
{
    if (!Discovered) {
        return SA_ERR_HPI_NOT_PRESENT;
    }
    for (SaHpiUint32T kind = SIM_PROCESSOR_BOARD; kind < SIM_KIND_COUNT; kind++) {
        const SaHpiUint32T instance = Entity->Entry[0].EntityInstance;
        if (instance < 1 || instance > countOf(static_cast<SimKindT>(kind))) {
            continue;
        }
        SaHpiEntityPathT path;
        entityPath(static_cast<SimKindT>(kind), instance, &path);
        if (memcmp(&path, Entity, sizeof(path)) == 0) {
            *Kind = static_cast<SimKindT>(kind);
            *Instance = instance;
            return SA_OK;
        }
    }
    return SA_ERR_HPI_NOT_PRESENT;
}

SimResourceT *residentAt(SimKindT Kind, SaHpiUint32T Instance) noexcept
{
    for (SaHpiUint32T i = 0; i < ResourceCount; i++) {
        if (Resources[i]->Shape->Kind == Kind && Resources[i]->Instance == Instance) {
            return Resources[i];
        }
    }
    return nullptr;
}

// A board put in an empty place: a new resource, unpowered, registered and
// then sent into INSERTION_PENDING. The place is the caller's already.
SaErrorT insertFru(SimKindT Kind, SaHpiUint32T Instance) noexcept
{
    KviCsRwLockT *lock = nullptr;
    SaErrorT rc =
        kviDsMaplManagerUnprotectedGetMaplLock(MaplNum, placeOf(Kind, Instance) % LockCount, &lock);
    SimResourceT *resource = nullptr;
    if (rc == SA_OK) {
        resource = allocateResource(simResourceShape(Kind), Instance);
        rc = resource == nullptr ? SA_ERR_HPI_OUT_OF_SPACE : SA_OK;
    }
    if (rc == SA_OK) {
        resource->HotSwap.State = SAHPI_HS_STATE_NOT_PRESENT;
        resource->PowerState = SAHPI_HS_POWER_OFF;
        rc = registerResource(ShelfDomain, resource, lock);
    }
    if (rc != SA_OK) {
        markPresent(Kind, Instance, SAHPI_FALSE);
        return rc;
    }
    SimLock hold(resource);
    simHotSwapInserted(resource);
    return SA_OK;
}

} // namespace

extern "C" __attribute__((visibility("default"))) SaErrorT
kviSimHotSwapDrive(const SaHpiEntityPathT *Entity, SaHpiBoolT Insert) noexcept
{
    if (Entity == nullptr || Insert > SAHPI_TRUE) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    SimKindT kind = SIM_CHASSIS;
    SaHpiUint32T instance = 0;
    pthread_mutex_lock(&Registry);
    SaErrorT rc = findFru(Entity, &kind, &instance);
    SimResourceT *resident = nullptr;
    if (rc == SA_OK) {
        SaHpiBoolT &present = Present[placeOf(kind, instance)];
        resident = present ? residentAt(kind, instance) : nullptr;
        if (present == Insert || (!Insert && resident == nullptr)) {
            rc = SA_ERR_HPI_INVALID_REQUEST;
        } else if (Insert) {
            present = SAHPI_TRUE; // the place is the insertion's from now on
        }
    }
    pthread_mutex_unlock(&Registry);
    if (rc != SA_OK || Insert) {
        return rc != SA_OK ? rc : insertFru(kind, instance);
    }
    {
        SimLock lock(resident);
        rc = simHotSwapPull(resident);
    }
    simDepartIfDue(resident);
    return rc;
}

extern "C" __attribute__((visibility("default"))) SaErrorT
kviSimClockAdvance(SaHpiTimeoutT Elapsed) noexcept
{
    if (Elapsed < 0) {
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    pthread_mutex_lock(&ClockMutex);
    if (!ManualClock) {
        ManualNowNs = monotonicNs();
        ManualClock = SAHPI_TRUE;
    }
    ManualNowNs = Elapsed > INT64_MAX - ManualNowNs ? INT64_MAX : ManualNowNs + Elapsed;
    pthread_mutex_unlock(&ClockMutex);
    hotSwapTick();
    return SA_OK;
}

// ---- The function tables ----
//
// Every resource shares one table; every record type has its own, built on
// one base, so that parameter control can differ by type.

namespace
{

struct SimRptParmSlotsT {
    SaErrorT (*Default)(SaHpiDomainIdT, SaHpiResourceIdT);
    KviDsSaveRptParmCtrl Save;
    KviDsRestoreRptParmCtrl Restore;
};

struct SimRdrParmSlotsT {
    KviDsDefaultRdrParmCtrl Default;
    KviDsSaveRdrParmCtrl Save;
    KviDsRestoreRdrParmCtrl Restore;
};

// Parameter control (RPT slots 24-26, RDR slots 16-18). Saving and restoring
// go through the library's implementations, which keep the settings in its
// non-volatile store, so they survive a restart of the daemon. Defaults the
// library has no implementation for (the resource itself, sensors,
// inventory, watchdogs) are the simulator's own: they put the initial values
// back. Inventory and watchdog data are not kept across a restart.
constexpr SimRptParmSlotsT RptParmSlots = {simRptDefaultParmControl, kviCsRptSaveParmControl,
                                           kviCsRptRestoreParmControl};
constexpr SimRdrParmSlotsT SensorParmSlots = {simRdrDefaultParmControl,
                                              kviCsRdrSaveSensorParmControl, kviCsRdrRestoreSensor};
constexpr SimRdrParmSlotsT ControlParmSlots = {kviCsRestoreControlDefaults,
                                               kviCsRdrSaveCtrlParmControl, kviCsRdrRestoreCtrl};
constexpr SimRdrParmSlotsT InventoryParmSlots = {simRdrDefaultParmControl, nullptr, nullptr};
constexpr SimRdrParmSlotsT WatchdogParmSlots = {simRdrDefaultParmControl, simRdrSaveParmControl,
                                                simRdrRestoreParmControl};

constexpr KviDsRdrFnTable rdrTable(const SimRdrParmSlotsT &Parm) noexcept
{
    return {
        simSensorReadingGet,
        simSensorReadingConvert,
        simSensorThresholdsGet,
        simSensorThresholdsSet,
        simSensorEventEnablesGet,
        simSensorEventEnablesSet,
        simControlStateGet,
        simControlStateSet,
        simWatchdogTimerGet,
        simWatchdogTimerSet,
        simWatchdogTimerReset,
        simEntityInventoryDataRead,
        simEntityInventoryDataWrite,
        simActiveAlarmTranslate,
        simRdrResourcesRemove,
        Parm.Default,
        Parm.Save,
        Parm.Restore,
    };
}

} // namespace

KviDsRptFnTable simRptFnTable = {
    simEventLogInfoGet,
    simEventLogEntryGet,
    simEventLogEntryAdd,
    simEventLogEntryDelete,
    simEventLogClear,
    simEventLogTimeGet,
    simEventLogTimeSet,
    simEventLogStateGet,
    simEventLogStateSet,
    simHotSwapControlRequest,
    simResourceActiveSet,
    simResourceInactiveSet,
    simAutoExtractTimeoutGet,
    simAutoExtractTimeoutSet,
    simHotSwapStateGet,
    simHotSwapActionRequest,
    simResourcePowerStateGet,
    simResourcePowerStateSet,
    simHotSwapIndicatorStateGet,
    simHotSwapIndicatorStateSet,
    simResourceResetStateGet,
    simResourceResetStateSet,
    simRptEntryResourcesRemove,
    RptParmSlots.Default,
    RptParmSlots.Save,
    RptParmSlots.Restore,
};

// Indexed by record type.
KviDsRdrFnTable simRdrFnTables[SIM_RDR_TYPES] = {
    rdrTable(SensorParmSlots), // SAHPI_NO_RECORD: never registered
    rdrTable(ControlParmSlots),   rdrTable(SensorParmSlots),
    rdrTable(InventoryParmSlots), rdrTable(WatchdogParmSlots),
};

// The one symbol the plug-in manager looks up.
extern "C" {
extern __attribute__((visibility("default"))) KviMaplInitTableT KviMaplInitTable;
}
KviMaplInitTableT KviMaplInitTable = {
    simGetVersion,
    simMaplInitialization,
    simMaplFinalization,
    simResourcesDiscover,
};
