// File status in the units the rest of the library compares: HPI time
// (nanoseconds) and bytes.
#include "kvi/KviTime.h"

#include <cerrno>
#include <cstring>
#include <sys/stat.h>

#include "core/utils/KviTrace.h"

extern "C" KVI_EXPORT SaErrorT kviCsGetFileInfo(const char *FileName, SaHpiInt64T *ModificationTime,
                                                SaHpiInt32T *Size) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(FileName);
    struct stat status;
    if (stat(FileName, &status) != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "stat returned %s", strerror(errno));
        return SA_ERR_HPI_ERROR;
    }
    if (ModificationTime != nullptr)
        *ModificationTime = static_cast<SaHpiInt64T>(status.st_mtime) * 1000000000LL;
    if (Size != nullptr)
        *Size = static_cast<SaHpiInt32T>(status.st_size);
    return SA_OK;
}
