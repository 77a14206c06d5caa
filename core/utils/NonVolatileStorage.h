// Private parts of the non-volatile object store: the object file layout, the
// in-memory list entry, the list helpers and the file I/O seam. Nothing here
// is exported; the unit tests and the fuzz target link the objects directly.
#pragma once

#include <fcntl.h>
#include <sys/types.h>
#include <unistd.h>

#include "SaHpi.h"
#include "kvi/KviNonVolatile.h"
#include "kvi/KviSemaphore.h"

constexpr SaHpiUint8T NV_VERSION = 1;
constexpr SaHpiUint32T NV_OBJECT_LIST_INCREMENT = 10;
constexpr SaHpiUint32T MIN_CFG_NV_OBJECTS = 10;
constexpr SaHpiUint32T MAX_CFG_NV_OBJECTS = 100000;
constexpr SaHpiUint32T DEFAULT_MAX_NV_OBJECTS = 1000;
constexpr SaHpiUint32T NV_INVALID_LIST_ENTRY = 0xffffffff;
constexpr SaHpiUint32T NV_INVALID_OBJECT_NUMBER = 0xffffffff;
// Longest key in bytes; KVI_MAX_NV_KEY_LENGTH counts the terminating NUL.
constexpr SaHpiUint32T NV_MAX_KEY_CHARS = KVI_MAX_NV_KEY_LENGTH - 1;
// Object files are named by their number as exactly this many digits.
constexpr int NV_FILE_NAME_DIGITS = 10;

// The first 12 bytes of every object file, in the host's byte order. The two
// reserved bytes keep the key aligned; they are written as zeros, ignored by
// readers, and covered by the CRC like everything after the Crc field.
typedef struct {
    SaHpiUint32T Size; // whole file: header + key + data
    SaHpiUint32T Crc;  // over bytes 8 .. Size-1
    SaHpiUint8T NvVersion;
    SaHpiUint8T KeyLen;
    SaHpiUint8T Reserved[2];
} NvObjHdrT;
static_assert(sizeof(NvObjHdrT) == 12, "the object file header is 12 bytes on every target");

// The header followed by KeyLen key bytes (no NUL) and the caller's data.
typedef struct {
    NvObjHdrT Hdr;
    SaHpiUint8T KeyAndData[];
} NvObjectT;

// One object the store knows about. An entry of a put in progress is not
// Valid, so lookups pass over it until its file is complete.
typedef struct {
    SaHpiBoolT Valid;
    SaHpiUint32T FileNumber;
    char KeyName[KVI_MAX_NV_KEY_LENGTH]; // NUL-padded
} NvListItemT;

// The lookup, add and remove helpers need NvObjectListSem held by the
// caller (remove takes it itself when NeedLock is true); a caller that forgot
// ends the process.
SaHpiUint32T findNvObjectInList(const char *Key, SaHpiUint8T KeyLen) noexcept;
SaHpiUint32T findNvObjectInListByFileNumber(SaHpiUint32T FileNumber) noexcept;
SaErrorT addNvObjectToList(const char *Key, SaHpiUint8T KeyLen, const char *FileName,
                           SaHpiBoolT Valid, SaHpiUint32T *ObjectIndex) noexcept;
SaErrorT deleteNvObjectFromList(SaHpiUint32T ObjectIndex, SaHpiBoolT NeedLock) noexcept;
// The lowest object number that no valid entry uses, for a new file; puts are
// serialized by NvObjectDeleteSem, so it cannot be taken before the file
// exists. NV_INVALID_OBJECT_NUMBER when every number is in use.
SaHpiUint32T lowestFreeObjectNumber() noexcept;

SaHpiBoolT nvKeyIsValid(const char *Key, SaHpiUint8T KeyLen) noexcept;
// Checks the object file at FilePath and, when it is sound, hands the whole
// object to the caller, who frees it with KVI_CS_FREE. Damaged files are
// deleted; files that cannot be read are left alone.
SaHpiBoolT nvObjectIsValid(const char *FilePath, NvObjectT **NvObject) noexcept;

// Every open, read, write, sync, close and unlink of object files goes
// through this table, so a test can make any of them fail (a full disk, an
// I/O error) without a real device. Restore it from kviCsNvDefaultFileOps.
struct KviNvFileOpsT {
    int (*openFile)(const char *Path, int Flags, mode_t Mode);
    ssize_t (*readFile)(int Fd, void *Buffer, size_t Count);
    ssize_t (*writeFile)(int Fd, const void *Buffer, size_t Count);
    int (*syncFile)(int Fd);
    int (*closeFile)(int Fd);
    int (*unlinkFile)(const char *Path);
};
extern KviNvFileOpsT kviCsNvFileOps;
extern const KviNvFileOpsT kviCsNvDefaultFileOps;

// The store's two semaphores, for tests that need to hold one.
KviCsSemaphore *kviCsNvListSemaphore() noexcept;
KviCsSemaphore *kviCsNvDeleteSemaphore() noexcept;
