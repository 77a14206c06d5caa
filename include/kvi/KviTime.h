/* Clock readings, a calendar breakdown safe inside the logger, file
 * information and the switch into the background. */
#ifndef KVI_TIME_H
#define KVI_TIME_H

#include <time.h>

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

KVI_API SaErrorT kviCsGetSaHpiTime(SaHpiTimeT *Time) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetSecondsAndMilliseconds(SaHpiUint32T *Seconds,
                                                SaHpiUint32T *MSeconds) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetSecondsAndMillisecondsNoLogging(SaHpiUint32T *Seconds,
                                                         SaHpiUint32T *MSeconds) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsTimeGetGmTimeNoLogging(SaHpiUint32T Seconds,
                                             struct tm *TimeStruct) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetFileInfo(const char *FileName, SaHpiInt64T *ModificationTime,
                                  SaHpiInt32T *Size) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDaemonize(void) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
