// The non-volatile object store: one file per object in one directory, each
// file holding a header with its size and CRC, the key and the caller's
// bytes. The list in memory only maps keys to file numbers; object data is
// read from disk on every get, so what a get returns is what survives a
// restart.
//
// A put writes a complete new file under an unused number before it removes
// the old file of the key, so a crash at any moment leaves at least one
// complete object of the key on disk. Initialization cleans up after such a
// crash: damaged files are deleted, and of two files with one key the one
// met later in directory order goes.
#include "core/utils/NonVolatileStorage.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <optional>
#include <sys/stat.h>

#include "core/utils/KviTrace.h"
#include "kvi/KviConfig.h"
#include "kvi/KviMemory.h"

namespace
{
constexpr SaHpiUint32T NV_DELETE_SEM_TIMEOUT = 1000; // milliseconds
constexpr SaHpiUint32T NV_LIST_SEM_TIMEOUT = 10;     // milliseconds
constexpr SaHpiUint32T NV_STORAGE_DIR_BUFFER = 300;
constexpr SaHpiUint32T NV_MAX_OBJECTS_BUFFER = 32;
constexpr SaHpiUint32T NV_MAX_BYTES_TO_WRITE = 0x7FFFFFFE;
constexpr SaHpiUint32T NV_HEADER_SIZE = sizeof(NvObjHdrT);
constexpr SaHpiUint32T NV_KEY_SLOT = KVI_MAX_NV_KEY_LENGTH;

NvListItemT *NvObjectList = nullptr;
SaHpiUint32T NvObjectListSize = 0;    // capacity in entries
SaHpiUint32T CurrentLastNvObject = 0; // entries in use, packed at the front
SaHpiUint32T MaxObjects = DEFAULT_MAX_NV_OBJECTS;
char *NvStorageDir = nullptr;
// Read before any lock by every operation's preamble.
std::atomic<SaHpiBoolT> NvInitialized{SAHPI_FALSE};
bool NvSemaphoresCreated = false;
// Serializes the operations that change files (put, delete); taken before
// NvObjectListSem, which guards the list.
KviCsSemaphore NvObjectDeleteSem;
KviCsSemaphore NvObjectListSem;

int defaultOpen(const char *Path, int Flags, mode_t Mode)
{
    return open(Path, Flags, Mode);
}

// ---------------------------------------------------------------------------
// Small helpers

// The list helpers trust their caller to hold the list lock. A try-wait that
// succeeds proves it did not, and a list changed without its lock cannot be
// trusted any more.
void requireListLocked()
{
    if (KVI_CS_SEM_TRYWAIT(&NvObjectListSem) != SA_ERR_HPI_BUSY) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "NvObjectListSem was not locked");
        exit(1);
    }
}

// A lock waited for in vain ends the operation with this line.
bool lockHeld(const KviSemGuard &Guard)
{
    if (Guard.held())
        return true;
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_SEM_WAIT failed. rc=%d", Guard.result());
    return false;
}

SaErrorT initializedOrWhyNot()
{
    if (NvInitialized.load())
        return SA_OK;
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "NV storage is not initialized.");
    return SA_ERR_HPI_UNINITIALIZED;
}

// The check of the operations that need both the list lock and a store that
// is still initialized once they hold it (a finalize may have come first).
SaErrorT listUsable(const KviSemGuard &List)
{
    return lockHeld(List) ? initializedOrWhyNot() : SA_ERR_HPI_ERROR;
}

// Only names of exactly ten digits are object files. A number that does not
// fit the 32-bit object numbers (or is the invalid number) cannot be one of
// ours and is left alone like any other foreign file.
bool isObjectFileName(const char *Name)
{
    unsigned long long value = 0;
    int i = 0;
    for (; Name[i] != '\0'; ++i) {
        if (i >= NV_FILE_NAME_DIGITS || Name[i] < '0' || Name[i] > '9')
            return false;
        value = value * 10 + static_cast<unsigned>(Name[i] - '0');
    }
    return i == NV_FILE_NAME_DIGITS && value < NV_INVALID_OBJECT_NUMBER;
}

// "KviMaxNvObjects" is taken as a decimal number the way strtoul reads it on
// the 32-bit target (a leading minus negates, overflow saturates), so that a
// 64-bit build accepts and refuses exactly the same values.
SaHpiUint32T decimalToUint32(const char *Text)
{
    errno = 0;
    unsigned long long value = strtoull(Text, nullptr, 10);
    if (errno == ERANGE)
        return 0xFFFFFFFF;
    if (value <= 0xFFFFFFFFull)
        return static_cast<SaHpiUint32T>(value);
    unsigned long long magnitude = 0ull - value; // strtoull negated a "-n"
    if (magnitude <= 0xFFFFFFFFull)
        return static_cast<SaHpiUint32T>(value);
    return 0xFFFFFFFF;
}

// "dir/0000000012" for object number 12. The caller frees the path and
// holds the list lock (or is the initialization), since NvStorageDir is read.
char *makeFilePath(const char *Dir, const char *Name)
{
    size_t length = strlen(Dir) + 1 + strlen(Name) + 1;
    auto *path = static_cast<char *>(KVI_CS_MALLOC(length));
    if (path == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not allocate space for filePath");
        return nullptr;
    }
    snprintf(path, length, "%s/%s", Dir, Name);
    return path;
}

void formatFileName(SaHpiUint32T Number, char (&Name)[NV_FILE_NAME_DIGITS + 1])
{
    snprintf(Name, sizeof Name, "%10.10u", Number);
}

char *makeObjectPath(SaHpiUint32T Number)
{
    char name[NV_FILE_NAME_DIGITS + 1];
    formatFileName(Number, name);
    return makeFilePath(NvStorageDir, name);
}

// The key of an object as a string, for messages and comparisons.
void objectKey(const NvObjectT *Object, char (&Key)[KVI_MAX_NV_KEY_LENGTH])
{
    memset(Key, 0, sizeof Key);
    SaHpiUint32T length = Object->Hdr.KeyLen;
    memcpy(Key, Object->KeyAndData, length < NV_MAX_KEY_CHARS ? length : NV_MAX_KEY_CHARS);
}

bool keyEquals(const NvListItemT &Item, const char *Key, SaHpiUint8T KeyLen)
{
    return strnlen(Item.KeyName, sizeof Item.KeyName) == KeyLen &&
           memcmp(Item.KeyName, Key, KeyLen) == 0;
}

// The index of the first entry that matches, for callers holding the list lock.
template <typename MatchT> SaHpiUint32T findEntry(MatchT Matches)
{
    requireListLocked();
    for (SaHpiUint32T i = 0; i < CurrentLastNvObject; ++i)
        if (Matches(NvObjectList[i]))
            return i;
    return NV_INVALID_LIST_ENTRY;
}

// The lookups proper pass over the entry of a put in progress and name what
// they found in their exit line; ExitText outlives the caller's trace.
using ExitTextT = char[32];
template <typename MatchT>
SaHpiUint32T findValidEntry(KviFunctionTrace &Trace, ExitTextT &ExitText, MatchT Matches)
{
    snprintf(ExitText, sizeof ExitText, "Not Found");
    Trace.exitMessage(ExitText);
    SaHpiUint32T index =
        findEntry([&](const NvListItemT &Item) { return Item.Valid && Matches(Item); });
    if (index != NV_INVALID_LIST_ENTRY)
        snprintf(ExitText, sizeof ExitText, "Found %u", index);
    return index;
}

bool unlinkObjectFile(const char *Path)
{
    if (kviCsNvFileOps.unlinkFile(Path) == 0)
        return true;
    int err = errno;
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not delete object file %s. err=%d(%s)", Path, err,
             strerror(err));
    return false;
}

// A file that no list entry names any more: a deleted object's, the one a
// put replaced, or the new one of a put that failed after writing it.
bool unlinkFormerFile(const char *Path)
{
    KVI_DLOG(KVI_LOG_DBG_H, "Attempting to delete  %s", Path);
    return unlinkObjectFile(Path);
}

void deleteDamagedFile(const char *Path)
{
    KVI_ILOG(KVI_LOG_INFO, "Attempting to delete %s", Path);
    unlinkObjectFile(Path);
}

// Drops whatever an earlier initialization left behind (a finalize whose
// list lock timed out, or an initialization that failed half-way).
void forgetStore()
{
    if (NvStorageDir != nullptr)
        KVI_CS_FREE(NvStorageDir);
    if (NvObjectList != nullptr)
        KVI_CS_FREE(NvObjectList);
    NvObjectListSize = 0;
    CurrentLastNvObject = 0;
}

// The entry of the put in progress. Its index can change while the list lock
// is not held (a get may drop a damaged entry in front of it), so it is found
// again by its number: being serialized, only one put has such an entry.
SaHpiUint32T findPendingEntry(SaHpiUint32T FileNumber)
{
    return findEntry(
        [&](const NvListItemT &Item) { return !Item.Valid && Item.FileNumber == FileNumber; });
}

void removePendingEntry(SaHpiUint32T FileNumber)
{
    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (!lockHeld(list))
        return;
    SaHpiUint32T index = findPendingEntry(FileNumber);
    if (index != NV_INVALID_LIST_ENTRY)
        deleteNvObjectFromList(index, SAHPI_FALSE);
}

SaErrorT resultOfFileError(int Err)
{
    return Err == ENOSPC ? SA_ERR_HPI_OUT_OF_SPACE : SA_ERR_HPI_ERROR;
}

// Builds the whole object in memory so that it reaches the file in a single
// synchronous write.
NvObjectT *buildObject(const char *Key, SaHpiUint8T KeyLen, SaHpiUint32T BytesToWrite,
                       const void *Buffer, SaHpiUint32T *Size)
{
    *Size = NV_HEADER_SIZE + KeyLen + BytesToWrite;
    auto *object = static_cast<NvObjectT *>(KVI_CS_MALLOC(*Size));
    if (object == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not allocate space for object");
        return nullptr;
    }
    object->Hdr.Size = *Size;
    object->Hdr.NvVersion = NV_VERSION;
    object->Hdr.KeyLen = KeyLen;
    object->Hdr.Reserved[0] = 0;
    object->Hdr.Reserved[1] = 0;
    memcpy(object->KeyAndData, Key, KeyLen);
    memcpy(object->KeyAndData + KeyLen, Buffer, BytesToWrite);
    const auto *bytes = reinterpret_cast<const SaHpiUint8T *>(object);
    object->Hdr.Crc = kviCsCrcGen(bytes + 8, static_cast<SaHpiInt32T>(*Size - 8));
    return object;
}

// Makes the new file's directory entry durable before the old file of the
// key is unlinked; without it a power loss could keep the unlink and lose
// the creation.
void syncDirectoryOf(char *Path)
{
    char *slash = strrchr(Path, '/');
    if (slash == nullptr)
        return;
    *slash = '\0';
    int fd = kviCsNvFileOps.openFile(Path, O_RDONLY | O_DIRECTORY, 0);
    if (fd >= 0) {
        if (kviCsNvFileOps.syncFile(fd) != 0) {
            int err = errno;
            KVI_DLOG(KVI_LOG_DBG_H, "Could not sync directory %s. err=%d(%s)", Path, err,
                     strerror(err));
        }
        kviCsNvFileOps.closeFile(fd);
    }
    *slash = '/';
}

// The new file of a put, written in one synchronous write.
SaErrorT writeObjectFile(char *Path, const char *Key, SaHpiUint8T KeyLen, SaHpiUint32T BytesToWrite,
                         const void *Buffer)
{
    SaHpiUint32T size = 0;
    NvObjectT *object = buildObject(Key, KeyLen, BytesToWrite, Buffer, &size);
    if (object == nullptr)
        return SA_ERR_HPI_ERROR;
    int fd = kviCsNvFileOps.openFile(Path, O_RDWR | O_CREAT | O_TRUNC | O_SYNC, 0600);
    if (fd < 0) {
        int err = errno;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not open \"%s\". errno=%d(%s)", Path, err,
                 strerror(err));
        KVI_CS_FREE(object);
        return resultOfFileError(err);
    }
    errno = 0;
    ssize_t written = kviCsNvFileOps.writeFile(fd, object, size);
    int err = errno;
    KVI_CS_FREE(object);
    if (written != static_cast<ssize_t>(size)) {
        // The partial file stays; the next initialization discards it.
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "write failed. bw=%d, errno=%d(%s)",
                 static_cast<int>(written), err, strerror(err));
        kviCsNvFileOps.closeFile(fd);
        return resultOfFileError(err);
    }
    kviCsNvFileOps.closeFile(fd);
    syncDirectoryOf(Path);
    return SA_OK;
}

// The first half of a put, under the list lock: the number of the new file
// and an entry for it, not valid until the file is complete.
SaErrorT reserveObjectNumber(const char *Key, SaHpiUint8T KeyLen, SaHpiUint32T *Number, char **Path)
{
    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (SaErrorT usable = listUsable(list); usable != SA_OK)
        return usable;
    SaHpiUint32T number = lowestFreeObjectNumber();
    KVI_DLOG(KVI_LOG_DBG_H, "ObjectNumber to use is %u", number);
    if (number == NV_INVALID_OBJECT_NUMBER) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Could not find an unused object number. This should never happen.");
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    char name[NV_FILE_NAME_DIGITS + 1];
    formatFileName(number, name);
    SaHpiUint32T index = NV_INVALID_LIST_ENTRY;
    SaErrorT rc = addNvObjectToList(Key, KeyLen, name, SAHPI_FALSE, &index);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "addNvObjectToList failed for key %s. rc=%d", Key, rc);
        return rc == SA_ERR_HPI_OUT_OF_SPACE ? SA_ERR_HPI_OUT_OF_SPACE : SA_ERR_HPI_ERROR;
    }
    *Path = makeFilePath(NvStorageDir, name);
    if (*Path == nullptr) {
        deleteNvObjectFromList(index, SAHPI_FALSE);
        return SA_ERR_HPI_ERROR;
    }
    *Number = number;
    return SA_OK;
}

// The second half of a put, once the file is complete: the new object becomes
// the key's object and the old one, if any, leaves the list. Path, the new file's, is turned into
// the old file's path for the unlink, which happens outside the list lock; both names have ten
// digits, so no allocation can fail half-way through.
SaErrorT publishObject(const char *Key, SaHpiUint8T KeyLen, SaHpiUint32T Number, char *Path,
                       bool *OldFileToDelete)
{
    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (!lockHeld(list)) {
        removePendingEntry(Number);
        return SA_ERR_HPI_ERROR;
    }
    SaHpiUint32T newIndex = findPendingEntry(Number);
    if (newIndex == NV_INVALID_LIST_ENTRY) {
        // The store was finalized while the file was written.
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "NV storage is not initialized.");
        return SA_ERR_HPI_ERROR;
    }
    SaHpiUint32T oldIndex = findNvObjectInList(Key, KeyLen);
    if (oldIndex == NV_INVALID_LIST_ENTRY) {
        KVI_DLOG(KVI_LOG_DBG_L, "Key %s does not yet exist. Marking new object as valid.", Key);
        NvObjectList[newIndex].Valid = SAHPI_TRUE;
        return SA_OK;
    }
    SaHpiUint32T oldNumber = NvObjectList[oldIndex].FileNumber;
    KVI_DLOG(KVI_LOG_DBG_L, "Key %s already exists. Deleting old obj %10.10d at index %u", Key,
             oldNumber, oldIndex);
    NvObjectList[newIndex].Valid = SAHPI_TRUE;
    char name[NV_FILE_NAME_DIGITS + 1];
    formatFileName(oldNumber, name);
    memcpy(Path + strlen(Path) - NV_FILE_NAME_DIGITS, name, NV_FILE_NAME_DIGITS);
    *OldFileToDelete = true;
    deleteNvObjectFromList(oldIndex, SAHPI_FALSE);
    return SA_OK;
}

// One object file met at initialization: a new key joins the list, a key
// already there makes this file the duplicate to delete.
SaErrorT registerScannedObject(const char *Path, const char *Name, const NvObjectT *Object)
{
    char key[KVI_MAX_NV_KEY_LENGTH];
    objectKey(Object, key);
    SaHpiUint32T existingNumber = NV_INVALID_OBJECT_NUMBER;
    {
        KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
        if (!lockHeld(list))
            return SA_ERR_HPI_ERROR;
        SaHpiUint32T index = findNvObjectInList(key, Object->Hdr.KeyLen);
        if (index == NV_INVALID_LIST_ENTRY) {
            SaErrorT rc = addNvObjectToList(key, Object->Hdr.KeyLen, Name, SAHPI_TRUE, &index);
            if (rc != SA_OK)
                KVI_ELOG(KVI_LOG_ERR_NONFATAL, "addNvObjectToList failed. rc=%d", rc);
            return rc == SA_OK ? SA_OK : SA_ERR_HPI_ERROR;
        }
        existingNumber = NvObjectList[index].FileNumber;
    }
    KVI_WLOG(KVI_LOG_WARN,
             "Object file %s has a duplicate key %s as existing file number %u.  Attempting to "
             "delete it.",
             Path, key, existingNumber);
    unlinkObjectFile(Path);
    return SA_OK;
}

// Every object file of the directory, in the order the directory yields
// them; of two files with one key the first one met is kept.
SaErrorT loadObjects(DIR *Dir)
{
    for (struct dirent *entry = readdir(Dir); entry != nullptr; entry = readdir(Dir)) {
        if (!isObjectFileName(entry->d_name)) {
            KVI_DLOG(KVI_LOG_DBG_L, "Skipping file \"%s\"", entry->d_name);
            continue;
        }
        char *path = makeFilePath(NvStorageDir, entry->d_name);
        if (path == nullptr)
            return SA_ERR_HPI_OUT_OF_SPACE;
        NvObjectT *object = nullptr;
        if (!nvObjectIsValid(path, &object)) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Object file %s is not valid.", path);
            KVI_CS_FREE(path);
            continue;
        }
        SaErrorT rc = registerScannedObject(path, entry->d_name, object);
        KVI_CS_FREE(object);
        KVI_CS_FREE(path);
        if (rc != SA_OK)
            return rc;
    }
    return SA_OK;
}

// The storage directory (required) and the object limit (optional).
SaErrorT readConfiguration()
{
    char dir[NV_STORAGE_DIR_BUFFER];
    if (kviCsCfgDataGet("KviNvStorageDir", sizeof dir, dir, nullptr) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_FATAL,
                 "kviCsCfgDataGet returned failure on KviNvStorageDir key. exiting.");
        exit(1);
    }
    SaHpiUint32T length = static_cast<SaHpiUint32T>(strlen(dir)) + 1;
    auto *copy = static_cast<char *>(KVI_CS_MALLOC(length));
    if (copy == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_FATAL, "KVI_CS_MALLOC failed: %u bytes for ipmi driver name.", length);
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    memcpy(copy, dir, length);
    NvStorageDir = copy;
    KVI_ILOG(KVI_LOG_INFO, "Using KviNvStorageDir value of %s.", NvStorageDir);

    char text[NV_MAX_OBJECTS_BUFFER];
    if (kviCsCfgDataGet("KviMaxNvObjects", sizeof text, text, nullptr) != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H,
                 "kviCsCfgDataGet returned failure on KviMaxNvObjects key. Using default value.");
        return SA_OK;
    }
    SaHpiUint32T value = decimalToUint32(text);
    if (value >= MIN_CFG_NV_OBJECTS && value <= MAX_CFG_NV_OBJECTS) {
        MaxObjects = value;
        KVI_ILOG(KVI_LOG_INFO, "Using KviMaxNvObjects value of %u.", MaxObjects);
    } else {
        KVI_WLOG(KVI_LOG_WARN,
                 "KviMaxNvObjects of %u is invalid. Using default.  Value must be >= %u and <= %u",
                 value, MIN_CFG_NV_OBJECTS, MAX_CFG_NV_OBJECTS);
    }
    return SA_OK;
}

SaErrorT createSemaphoresOnce()
{
    if (NvSemaphoresCreated)
        return SA_OK;
    SaErrorT rc = KVI_CS_SEM_INIT(&NvObjectListSem, 1);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_SEM_INIT failed on NvObjectListSem. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = KVI_CS_SEM_INIT(&NvObjectDeleteSem, 1);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_SEM_INIT failed on NvObjectDeleteSem. rc=%d", rc);
        KVI_CS_SEM_DESTROY(&NvObjectListSem);
        return SA_ERR_HPI_ERROR;
    }
    NvSemaphoresCreated = true;
    return SA_OK;
}

// Creates the storage directory if needed and loads the list from it.
SaErrorT openAndLoadDirectory()
{
    if (mkdir(NvStorageDir, 0777) != 0 && errno != EEXIST) {
        int err = errno;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not create directory %s. err=%d(%s)", NvStorageDir,
                 err, strerror(err));
        return SA_ERR_HPI_ERROR;
    }
    DIR *dir = opendir(NvStorageDir);
    if (dir == nullptr) {
        int err = errno;
        if (err == ENOTDIR)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "%s exists but isn't a directory. ", NvStorageDir);
        else
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not open directory %s. err=%d(%s)", NvStorageDir,
                     err, strerror(err));
        return SA_ERR_HPI_ERROR;
    }
    SaErrorT rc = loadObjects(dir);
    if (closedir(dir) != 0 && rc == SA_OK) {
        int err = errno;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not close directory. err=%d(%s)", err, strerror(err));
        rc = SA_ERR_HPI_ERROR;
    }
    return rc;
}

// The checks every operation starts with once its pointers are known good.
SaErrorT checkKeyAndState(const char *Key, SaHpiUint8T *KeyLen)
{
    // The length travels as 8 bits, as it is stored in the file header.
    *KeyLen = static_cast<SaHpiUint8T>(strlen(Key));
    if (!nvKeyIsValid(Key, *KeyLen)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "nvKeyIsValid returned false for key %s", Key);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    return initializedOrWhyNot();
}

// Looks the key up for a get and names its file; a get reads the file
// without any lock.
SaErrorT locateObject(const char *Key, SaHpiUint8T KeyLen, SaHpiUint32T *Index,
                      SaHpiUint32T *Number, char **Path)
{
    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (SaErrorT usable = listUsable(list); usable != SA_OK)
        return usable;
    *Index = findNvObjectInList(Key, KeyLen);
    if (*Index == NV_INVALID_LIST_ENTRY) {
        KVI_DLOG(KVI_LOG_DBG_H, "Key %s does not exist.", Key);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    *Number = NvObjectList[*Index].FileNumber;
    *Path = makeObjectPath(*Number);
    return *Path == nullptr ? SA_ERR_HPI_ERROR : SA_OK;
}

// A get found the key's file unusable: the entry goes, unless the list has
// moved on meanwhile (a put replaced the object, or the entry moved).
void dropInvalidEntry(const char *Key, SaHpiUint8T KeyLen, SaHpiUint32T Index, SaHpiUint32T Number)
{
    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (!lockHeld(list))
        return;
    if (Index < CurrentLastNvObject && NvObjectList[Index].Valid &&
        NvObjectList[Index].FileNumber == Number && keyEquals(NvObjectList[Index], Key, KeyLen))
        deleteNvObjectFromList(Index, SAHPI_FALSE);
}

SaErrorT copyObjectData(const NvObjectT *Object, const char *Path, const char *Key,
                        SaHpiUint32T ObjectOffset, SaHpiUint32T BytesToRead, void *Buffer,
                        SaHpiUint32T *BytesRead)
{
    SaHpiUint32T objectSize = Object->Hdr.Size - NV_HEADER_SIZE - Object->Hdr.KeyLen;
    KVI_DLOG(KVI_LOG_DBG_L, "size=%u, hdrsz=%u, keylen=%u, objectSize=%u", Object->Hdr.Size,
             NV_HEADER_SIZE, static_cast<SaHpiUint32T>(Object->Hdr.KeyLen), objectSize);
    const SaHpiUint8T *data = Object->KeyAndData + Object->Hdr.KeyLen;
    if (ObjectOffset >= objectSize) {
        *BytesRead = 0;
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Object file %s for key %s does not have any data to fulfill request.  "
                 "objectSize=%u, ObjectOffset=%u",
                 Path, Key, objectSize, ObjectOffset);
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    if (BytesToRead > objectSize - ObjectOffset) {
        *BytesRead = objectSize - ObjectOffset;
        memcpy(Buffer, data + ObjectOffset, *BytesRead);
        KVI_DLOG(KVI_LOG_DBG_H,
                 "Object file %s for key %s does not have enough data to fulfill request.  "
                 "objectSize=%u, ObjectOffset=%u, BytesToRead=%u",
                 Path, Key, objectSize, ObjectOffset, BytesToRead);
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    memcpy(Buffer, data + ObjectOffset, BytesToRead);
    *BytesRead = BytesToRead;
    return SA_OK;
}

// Reads the rest of the object after its Size field; on failure nothing
// stays allocated.
bool readWholeObject(const char *FilePath, int Fd, SaHpiUint32T Size, NvObjectT **NvObject)
{
    auto *object = static_cast<NvObjectT *>(KVI_CS_MALLOC(Size));
    if (object == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "KVI_CS_MALLOC failed to get %u bytes for %s.", Size,
                 FilePath);
        return false;
    }
    object->Hdr.Size = Size;
    errno = 0;
    ssize_t bytesRead =
        kviCsNvFileOps.readFile(Fd, reinterpret_cast<SaHpiUint8T *>(object) + 4, Size - 4);
    if (bytesRead != static_cast<ssize_t>(Size - 4)) {
        int err = errno;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "read failed to get the object. br=%d, errno=%d(%s)",
                 static_cast<int>(bytesRead), err, strerror(err));
        KVI_CS_FREE(object);
        return false;
    }
    *NvObject = object;
    return true;
}

// Checks a completely read object: CRC, version, key; logs the first fault.
bool objectContentIsSound(const char *FilePath, const NvObjectT *Object)
{
    const auto *bytes = reinterpret_cast<const SaHpiUint8T *>(Object);
    SaHpiUint32T crc = kviCsCrcGen(bytes + 8, static_cast<SaHpiInt32T>(Object->Hdr.Size - 8));
    if (crc != Object->Hdr.Crc) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Object in file %s fails crc check. file crc=0x%8.8x, calculated crc=0x%8.8x.",
                 FilePath, Object->Hdr.Crc, crc);
        return false;
    }
    if (Object->Hdr.NvVersion != NV_VERSION) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Incorrect object version in file %s. file=%u, should be %u",
                 FilePath, static_cast<SaHpiUint32T>(Object->Hdr.NvVersion),
                 static_cast<SaHpiUint32T>(NV_VERSION));
        return false;
    }
    // A key running past the end of the file is as bad as a key with a NUL.
    if (Object->Hdr.KeyLen > Object->Hdr.Size - NV_HEADER_SIZE ||
        !nvKeyIsValid(reinterpret_cast<const char *>(Object->KeyAndData), Object->Hdr.KeyLen)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "nvKeyIsValid returned false for key from file %s. ",
                 FilePath);
        return false;
    }
    return true;
}

// What reading an opened object file found: only damaged files are deleted,
// a file that could not be read (or not without memory) may be sound.
enum class FileVerdictT { Sound, Unreadable, Damaged };

FileVerdictT readObjectFile(const char *FilePath, int Fd, off_t FileSize, NvObjectT **Object)
{
    SaHpiUint32T size = 0;
    errno = 0;
    ssize_t bytesRead = kviCsNvFileOps.readFile(Fd, &size, sizeof size);
    if (bytesRead != static_cast<ssize_t>(sizeof size)) {
        int err = errno;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "read failed to get size of object from file %s. br=%d, errno=%d(%s)", FilePath,
                 static_cast<int>(bytesRead), err, strerror(err));
        return FileVerdictT::Unreadable;
    }
    if (static_cast<off_t>(size) != FileSize) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Object from file %s claims to be a different size than it actually is. fs=%d, "
                 "os=%d",
                 FilePath, static_cast<int>(FileSize), static_cast<int>(size));
        return FileVerdictT::Damaged;
    }
    // A size that agrees with the file but leaves no room for the header is
    // no object either; reading on would run past the buffer.
    if (size < NV_HEADER_SIZE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL,
                 "Object from file %s is too small to hold an object header. os=%u", FilePath,
                 size);
        return FileVerdictT::Damaged;
    }
    if (!readWholeObject(FilePath, Fd, size, Object))
        return FileVerdictT::Unreadable;
    if (objectContentIsSound(FilePath, *Object))
        return FileVerdictT::Sound;
    KVI_CS_FREE(*Object);
    *Object = nullptr;
    return FileVerdictT::Damaged;
}
} // namespace

KviNvFileOpsT kviCsNvFileOps = {defaultOpen, read, write, fsync, close, unlink};
const KviNvFileOpsT kviCsNvDefaultFileOps = {defaultOpen, read, write, fsync, close, unlink};

KviCsSemaphore *kviCsNvListSemaphore() noexcept
{
    return &NvObjectListSem;
}

KviCsSemaphore *kviCsNvDeleteSemaphore() noexcept
{
    return &NvObjectDeleteSem;
}

// ---------------------------------------------------------------------------
// The list

SaHpiUint32T findNvObjectInList(const char *Key, SaHpiUint8T KeyLen) noexcept
{
    ExitTextT exitText;
    KVI_TRACE("KeyLen=%u", static_cast<SaHpiUint32T>(KeyLen));
    return findValidEntry(trace, exitText, [&](const NvListItemT &Item) {
        return Key != nullptr && keyEquals(Item, Key, KeyLen);
    });
}

SaHpiUint32T findNvObjectInListByFileNumber(SaHpiUint32T FileNumber) noexcept
{
    ExitTextT exitText;
    KVI_TRACE("FileNumber=%u", FileNumber);
    return findValidEntry(trace, exitText,
                          [&](const NvListItemT &Item) { return Item.FileNumber == FileNumber; });
}

// The numbers are looked at a window at a time with a small bitmap, so a
// full list of 100000 objects costs a few passes rather than one pass per
// number tried.
SaHpiUint32T lowestFreeObjectNumber() noexcept
{
    requireListLocked();
    constexpr SaHpiUint32T WINDOW = 4096;
    for (SaHpiUint32T base = 0; base <= NV_INVALID_OBJECT_NUMBER - WINDOW; base += WINDOW) {
        SaHpiUint8T used[WINDOW / 8] = {};
        for (SaHpiUint32T i = 0; i < CurrentLastNvObject; ++i) {
            SaHpiUint32T offset = NvObjectList[i].FileNumber - base;
            if (NvObjectList[i].Valid && NvObjectList[i].FileNumber >= base && offset < WINDOW)
                used[offset / 8] |= static_cast<SaHpiUint8T>(1u << (offset % 8));
        }
        for (SaHpiUint32T offset = 0; offset < WINDOW; ++offset)
            if ((used[offset / 8] & (1u << (offset % 8))) == 0)
                return base + offset;
    }
    return NV_INVALID_OBJECT_NUMBER;
}

SaErrorT addNvObjectToList(const char *Key, SaHpiUint8T KeyLen, const char *FileName,
                           SaHpiBoolT Valid, SaHpiUint32T *ObjectIndex) noexcept
{
    KVI_TRACE("KeyLen=%u, Valid=%d", static_cast<SaHpiUint32T>(KeyLen), Valid);
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(FileName);
    KVI_NULL_CHECK(ObjectIndex);
    requireListLocked();
    if (CurrentLastNvObject >= NvObjectListSize) {
        SaHpiUint32T newSize = NvObjectListSize + NV_OBJECT_LIST_INCREMENT;
        if (newSize > MaxObjects) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Too Many NV objects.  Either delete some or raise the "
                                           "MaxNvObjects config option.");
            return SA_ERR_HPI_OUT_OF_SPACE;
        }
        SaHpiUint32T bytes = newSize * static_cast<SaHpiUint32T>(sizeof(NvListItemT));
        auto *grown = static_cast<NvListItemT *>(KVI_CS_REALLOC(NvObjectList, bytes));
        if (grown == nullptr) {
            KVI_ELOG(KVI_LOG_ERR_FATAL, "KVI_CS_REALLOC failed to get %u bytes for object list.",
                     bytes);
            exit(1);
        }
        NvObjectList = grown;
        NvObjectListSize = newSize;
        KVI_DLOG(KVI_LOG_DBG_H, "Expanded the object list.  It is now %u entries long.", newSize);
    }
    NvListItemT &item = NvObjectList[CurrentLastNvObject];
    memset(&item, 0, sizeof item);
    item.Valid = Valid;
    item.FileNumber = static_cast<SaHpiUint32T>(strtoul(FileName, nullptr, 10));
    memcpy(item.KeyName, Key, KeyLen < NV_MAX_KEY_CHARS ? KeyLen : NV_MAX_KEY_CHARS);
    *ObjectIndex = CurrentLastNvObject++;
    return SA_OK;
}

SaErrorT deleteNvObjectFromList(SaHpiUint32T ObjectIndex, SaHpiBoolT NeedLock) noexcept
{
    KVI_TRACE("ObjectIndex=%u, NeedLock=%d", ObjectIndex, NeedLock);
    std::optional<KviSemGuard> list;
    if (NeedLock) {
        list.emplace(&NvObjectListSem, NV_LIST_SEM_TIMEOUT, KVI_CALL_SITE("&NvObjectListSem"));
        if (!lockHeld(*list))
            return SA_ERR_HPI_ERROR;
    } else {
        requireListLocked();
    }
    if (ObjectIndex >= CurrentLastNvObject) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Object index %u is beyond the %u objects in the list.",
                 ObjectIndex, CurrentLastNvObject);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    if (ObjectIndex + 1 < CurrentLastNvObject) {
        KVI_DLOG(KVI_LOG_DBG_L, "Moving objects %u to %u in the list down by one entry.",
                 ObjectIndex + 1, CurrentLastNvObject - 1);
        memmove(&NvObjectList[ObjectIndex], &NvObjectList[ObjectIndex + 1],
                (CurrentLastNvObject - ObjectIndex - 1) * sizeof(NvListItemT));
    } else {
        KVI_DLOG(KVI_LOG_DBG_L,
                 "Object deleted %u, is the last object in the list. No moving of entries is "
                 "required.",
                 ObjectIndex);
    }
    --CurrentLastNvObject;
    return SA_OK;
}

// ---------------------------------------------------------------------------
// Checks

SaHpiBoolT nvKeyIsValid(const char *Key, SaHpiUint8T KeyLen) noexcept
{
    KVI_TRACE("KeyLen=%u", static_cast<SaHpiUint32T>(KeyLen));
    if (Key == nullptr)
        return SAHPI_FALSE;
    if (KeyLen < 1 || KeyLen > NV_MAX_KEY_CHARS) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid KeyLen. kl=%u, max is %u",
                 static_cast<SaHpiUint32T>(KeyLen), NV_MAX_KEY_CHARS);
        return SAHPI_FALSE;
    }
    for (SaHpiUint32T i = 0; i < KeyLen; ++i) {
        if (Key[i] == '\0') {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Found invalid character 0x%2.2x in key. ",
                     static_cast<unsigned>(static_cast<unsigned char>(Key[i])));
            return SAHPI_FALSE;
        }
    }
    return SAHPI_TRUE;
}

SaHpiBoolT nvObjectIsValid(const char *FilePath, NvObjectT **NvObject) noexcept
{
    KVI_TRACE("%s", FilePath != nullptr ? FilePath : "(null)");
    if (FilePath == nullptr || NvObject == nullptr)
        return SAHPI_FALSE;
    *NvObject = nullptr;
    struct stat status {
    };
    int st = stat(FilePath, &status);
    if (st != 0) {
        int err = errno;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "stat failed on file %s. st=%d. errno=%d(%s)", FilePath, st,
                 err, strerror(err));
        return SAHPI_FALSE;
    }
    int fd = kviCsNvFileOps.openFile(FilePath, O_RDONLY, 0);
    if (fd < 0) {
        int err = errno;
        if (err == ENOENT)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "file \"%s\" does not exist.", FilePath);
        else
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Could not open \"%s\". errno=%d(%s)", FilePath, err,
                     strerror(err));
        return SAHPI_FALSE;
    }
    NvObjectT *object = nullptr;
    FileVerdictT verdict = readObjectFile(FilePath, fd, status.st_size, &object);
    kviCsNvFileOps.closeFile(fd);
    if (verdict == FileVerdictT::Damaged)
        deleteDamagedFile(FilePath);
    if (verdict != FileVerdictT::Sound)
        return SAHPI_FALSE;
    *NvObject = object;
    return SAHPI_TRUE;
}

// ---------------------------------------------------------------------------
// Interface

extern "C" {

KVI_EXPORT SaErrorT kviCsNonVolatileInitialize(void) noexcept
{
    KVI_TRACE("");
    if (NvInitialized.load()) {
        KVI_DLOG(KVI_LOG_DBG_H, "NV storage is already initialized.");
        return SA_ERR_HPI_DUPLICATE;
    }
    forgetStore();
    SaErrorT rc = readConfiguration();
    if (rc == SA_OK)
        rc = createSemaphoresOnce();
    if (rc == SA_OK)
        rc = openAndLoadDirectory();
    if (rc != SA_OK) {
        // Nothing of a failed initialization stays: a later one starts afresh.
        forgetStore();
        trace.exitMessage("Error");
        return rc;
    }
    NvInitialized.store(SAHPI_TRUE);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsNonVolatileFinalize(void) noexcept
{
    KVI_TRACE("");
    if (SaErrorT rc = initializedOrWhyNot(); rc != SA_OK)
        return rc;
    NvInitialized.store(SAHPI_FALSE);
    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (!lockHeld(list))
        return SA_ERR_HPI_ERROR;
    forgetStore();
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsNonVolatilePut(const char *Key, SaHpiUint32T BytesToWrite,
                                        const void *Buffer) noexcept
{
    KVI_TRACE("BytesToWrite=%u", BytesToWrite);
    if (BytesToWrite < 1 || BytesToWrite > NV_MAX_BYTES_TO_WRITE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "BytesToWrite of %u is not valid", BytesToWrite);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(Buffer);
    SaHpiUint8T keyLen = 0;
    SaErrorT rc = checkKeyAndState(Key, &keyLen);
    if (rc != SA_OK)
        return rc;

    KVI_SEM_GUARD(files, &NvObjectDeleteSem, NV_DELETE_SEM_TIMEOUT);
    if (!lockHeld(files))
        return SA_ERR_HPI_ERROR;
    SaHpiUint32T number = NV_INVALID_OBJECT_NUMBER;
    char *path = nullptr;
    rc = reserveObjectNumber(Key, keyLen, &number, &path);
    if (rc != SA_OK)
        return rc;
    rc = writeObjectFile(path, Key, keyLen, BytesToWrite, Buffer);
    if (rc != SA_OK) {
        KVI_CS_FREE(path);
        removePendingEntry(number);
        return rc;
    }
    bool oldFileToDelete = false;
    rc = publishObject(Key, keyLen, number, path, &oldFileToDelete);
    // After a failure the new file goes: it is complete, and left behind it
    // could win over the old object at the next start. After a success path
    // names the replaced object's file.
    if (rc != SA_OK || oldFileToDelete)
        unlinkFormerFile(path);
    KVI_CS_FREE(path);
    return rc;
}

KVI_EXPORT SaErrorT kviCsNonVolatileGet(const char *Key, SaHpiUint32T ObjectOffset,
                                        SaHpiUint32T BytesToRead, void *Buffer,
                                        SaHpiUint32T *BytesRead) noexcept
{
    KVI_TRACE("ObjectOffset=%u, BytesToRead=%u", ObjectOffset, BytesToRead);
    KVI_NULL_CHECK(Key);
    KVI_NULL_CHECK(Buffer);
    KVI_NULL_CHECK(BytesRead);
    *BytesRead = 0;
    SaHpiUint8T keyLen = 0;
    SaErrorT rc = checkKeyAndState(Key, &keyLen);
    if (rc != SA_OK)
        return rc;
    if (BytesToRead == 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "BytesToRead is zero");
        return SA_ERR_HPI_INVALID_PARAMS;
    }

    SaHpiUint32T index = NV_INVALID_LIST_ENTRY;
    SaHpiUint32T number = NV_INVALID_OBJECT_NUMBER;
    char *path = nullptr;
    rc = locateObject(Key, keyLen, &index, &number, &path);
    if (rc != SA_OK)
        return rc;

    NvObjectT *object = nullptr;
    bool valid = nvObjectIsValid(path, &object);
    // A put that replaced the object after the lookup may have given the
    // number to another key already; that file is sound but not ours.
    if (valid && (object->Hdr.KeyLen != keyLen || memcmp(object->KeyAndData, Key, keyLen) != 0)) {
        KVI_CS_FREE(object);
        valid = false;
    }
    if (!valid) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Object file %s for key %s is not valid.", path, Key);
        dropInvalidEntry(Key, keyLen, index, number);
        KVI_CS_FREE(path);
        return SA_ERR_HPI_ERROR;
    }
    rc = copyObjectData(object, path, Key, ObjectOffset, BytesToRead, Buffer, BytesRead);
    KVI_CS_FREE(object);
    KVI_CS_FREE(path);
    return rc;
}

KVI_EXPORT SaErrorT kviCsNonVolatileDelete(const char *Key) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Key);
    SaHpiUint8T keyLen = 0;
    SaErrorT rc = checkKeyAndState(Key, &keyLen);
    if (rc != SA_OK)
        return rc;

    KVI_SEM_GUARD(files, &NvObjectDeleteSem, NV_DELETE_SEM_TIMEOUT);
    if (!lockHeld(files))
        return SA_ERR_HPI_ERROR;
    char *path = nullptr;
    {
        KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
        if (SaErrorT usable = listUsable(list); usable != SA_OK)
            return usable;
        SaHpiUint32T index = findNvObjectInList(Key, keyLen);
        if (index == NV_INVALID_LIST_ENTRY) {
            KVI_DLOG(KVI_LOG_DBG_H, "Key %s does not exist.", Key);
            return SA_ERR_HPI_NOT_PRESENT;
        }
        path = makeObjectPath(NvObjectList[index].FileNumber);
        if (path == nullptr)
            return SA_ERR_HPI_ERROR;
        deleteNvObjectFromList(index, SAHPI_FALSE);
    }
    rc = unlinkFormerFile(path) ? SA_OK : SA_ERR_HPI_ERROR;
    KVI_CS_FREE(path);
    return rc;
}

KVI_EXPORT SaErrorT kviCsNonVolatileFind(const char *SearchKey, SaHpiUint32T BufferSize,
                                         void *Buffer, SaHpiUint32T *BufferSizeReqd) noexcept
{
    KVI_TRACE("BufferSize=%u", BufferSize);
    KVI_NULL_CHECK(SearchKey);
    KVI_NULL_CHECK(Buffer);
    KVI_NULL_CHECK(BufferSizeReqd);
    SaHpiUint8T keyLen = 0;
    SaErrorT rc = checkKeyAndState(SearchKey, &keyLen);
    if (rc != SA_OK)
        return rc;

    KVI_SEM_GUARD(list, &NvObjectListSem, NV_LIST_SEM_TIMEOUT);
    if (SaErrorT usable = listUsable(list); usable != SA_OK)
        return usable;
    auto *slots = static_cast<char *>(Buffer);
    SaHpiUint32T count = 0;
    for (SaHpiUint32T i = 0; i < CurrentLastNvObject; ++i) {
        const NvListItemT &item = NvObjectList[i];
        if (!item.Valid || memcmp(item.KeyName, SearchKey, keyLen) != 0)
            continue;
        if (static_cast<unsigned long long>(count + 1) * NV_KEY_SLOT <= BufferSize)
            memcpy(slots + static_cast<size_t>(count) * NV_KEY_SLOT, item.KeyName, NV_KEY_SLOT);
        ++count;
    }
    *BufferSizeReqd = count * NV_KEY_SLOT;
    if (*BufferSizeReqd > BufferSize) {
        KVI_DLOG(KVI_LOG_DBG_H, "Caller provided Buffer of size %u was too small.  Needed %u.",
                 BufferSize, *BufferSizeReqd);
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    return SA_OK;
}

} // extern "C"
