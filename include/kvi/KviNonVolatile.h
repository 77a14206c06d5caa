/* The non-volatile object store: small keyed objects kept one per file in the
 * directory named by the "KviNvStorageDir" configuration key, each file
 * checked by a CRC, so that saved settings survive a restart of the daemon.
 *
 * Keys are 1 to 29 bytes (KVI_MAX_NV_KEY_LENGTH counts the terminating NUL).
 * Every function returns SA_OK or an SA_ERR_HPI_* code; results are written
 * through the out-pointers. */
#ifndef KVI_NON_VOLATILE_H
#define KVI_NON_VOLATILE_H

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

#define KVI_MAX_NV_KEY_LENGTH 30

/* Reads the configuration, creates the storage directory if needed and
 * loads the list of objects from the files found there. Damaged files and
 * duplicates of a key are deleted on the way. */
KVI_API SaErrorT kviCsNonVolatileInitialize(void) KVI_NOEXCEPT;

/* Forgets the list; the files stay on disk. */
KVI_API SaErrorT kviCsNonVolatileFinalize(void) KVI_NOEXCEPT;

/* Stores BytesToWrite (1 to 0x7FFFFFFE) bytes of Buffer under Key, replacing
 * an earlier object of the key. The new object is written completely before
 * the old one is removed. */
KVI_API SaErrorT kviCsNonVolatilePut(const char *Key, SaHpiUint32T BytesToWrite,
                                     const void *Buffer) KVI_NOEXCEPT;

/* Copies up to BytesToRead bytes of the object's data, starting at
 * ObjectOffset, into Buffer; *BytesRead tells how many. Fewer bytes than asked
 * give SA_ERR_HPI_DATA_TRUNCATED; an unknown key SA_ERR_HPI_NOT_PRESENT. */
KVI_API SaErrorT kviCsNonVolatileGet(const char *Key, SaHpiUint32T ObjectOffset,
                                     SaHpiUint32T BytesToRead, void *Buffer,
                                     SaHpiUint32T *BytesRead) KVI_NOEXCEPT;

/* Removes the object of Key. */
KVI_API SaErrorT kviCsNonVolatileDelete(const char *Key) KVI_NOEXCEPT;

/* Lists the keys that begin with SearchKey: each in a slot of
 * KVI_MAX_NV_KEY_LENGTH bytes of Buffer, NUL-padded. *BufferSizeReqd is the
 * size that all of them need; SA_ERR_HPI_DATA_TRUNCATED when that exceeds
 * BufferSize (the slots that fitted are filled). */
KVI_API SaErrorT kviCsNonVolatileFind(const char *SearchKey, SaHpiUint32T BufferSize, void *Buffer,
                                      SaHpiUint32T *BufferSizeReqd) KVI_NOEXCEPT;

/* CRC-32 (polynomial 0x04c11db7, most significant bit first, initial value
 * 0xFFFFFFFF, result complemented) of Size bytes; 0 when Size <= 0. A null
 * Data pointer ends the process. */
KVI_API SaHpiUint32T kviCsCrcGen(const void *Data, SaHpiInt32T Size) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
