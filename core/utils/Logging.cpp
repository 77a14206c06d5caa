// The process-wide log file. Every line of every module goes through
// kviCsLogger, which filters before it formats, so a line that the level
// drops costs almost nothing, and writes whole lines under one semaphore so
// lines of different threads never interleave.
#include "kvi/KviLogging.h"

#include <atomic>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <ctime>
#include <unistd.h>

#include <trio.h>

#include "core/utils/KviTrace.h"
#include "kvi/KviSemaphore.h"
#include "kvi/KviThread.h"
#include "kvi/KviTime.h"

// Read outside the semaphore by design: the filter runs before any lock.
// Until the log is opened nothing can be written, so the level starts above
// every line and the inline test drops them all without a call.
std::atomic<KviCsLogLevelSettingT> kviCsCurrentLogLevel{KVI_LOG_NUM_MASK};

namespace
{
constexpr SaHpiUint32T LOG_FLAGS_MASK = ~static_cast<SaHpiUint32T>(KVI_LOG_NUM_MASK);
constexpr SaHpiUint32T LOG_SEM_WAIT_MS = 500;
constexpr SaHpiUint32T LOG_CLOSE_WAIT_MS = 10000;
constexpr size_t STAMP_BUFFER_SIZE = 200;
constexpr int STAMP_MAX_CHARS = 199;
constexpr const char *TRUNCATION_MARKER = "<The following line has been truncated>\n";

// Atomics because the level and the handle are read outside the semaphore by
// design: the filter runs before any lock.
std::atomic<FILE *> logFileHandle{nullptr};
KviCsSemaphore logSem;
std::atomic<bool> SemIsInitialized{false};

bool validLevelNumber(KviCsLogLevelSettingT level)
{
    SaHpiUint32T num = level & KVI_LOG_NUM_MASK;
    return num >= KVI_LOG_MIN && num <= KVI_LOG_MAX;
}

// A numeric level mixed with category flags is meaningless; it is written
// as level 0 so that it is never filtered and stands out.
SaHpiUint32T normaliseLevel(SaHpiUint32T level)
{
    return ((level & KVI_LOG_NUM_MASK) != 0 && (level & LOG_FLAGS_MASK) != 0) ? 0 : level;
}

struct LevelLabel {
    const char *label;
    const char *prefix;
};

LevelLabel labelFor(SaHpiUint32T level)
{
    switch (level) {
    case KVI_LOG_ERR_NONFATAL_NUM:
    case KVI_LOG_ERR_FATAL_NUM:
        return {KVI_LOG_ERROR_STRING, ""};
    case KVI_LOG_WARN_NUM:
        return {KVI_LOG_WARNING_STRING, ""};
    case KVI_LOG_INFO_NUM:
        return {KVI_LOG_INFO_STRING, ""};
    case KVI_LOG_DBG_L_NUM:
    case KVI_LOG_DBG_H_NUM:
        return {KVI_LOG_DEBUG_STRING, ""};
    case KVI_LOG_MEM_NUM:
        return {KVI_LOG_MEM_STRING, ""};
    case KVI_LOG_SEM_NUM:
        return {KVI_LOG_SEM_STRING, ""};
    case KVI_LOG_FUNC_IN_NUM:
        return {KVI_LOG_FUNC_IN_STRING, KVI_LOG_FUNCTION_ENTRY};
    case KVI_LOG_FUNC_OUT_NUM:
        return {KVI_LOG_FUNC_OUT_STRING, KVI_LOG_FUNCTION_EXIT};
    default:
        return {KVI_LOG_INVALID_STRING, ""};
    }
}

struct TimeStamp {
    char date[STAMP_BUFFER_SIZE] = "";
    char millis[STAMP_BUFFER_SIZE] = "";
};

// The stamp's fallbacks are layered as they are so that a failed date only
// shows when the milliseconds fail as well.
void stampNow(TimeStamp &stamp)
{
    SaHpiUint32T seconds = 0;
    SaHpiUint32T mseconds = 0;
    if (kviCsGetSecondsAndMillisecondsNoLogging(&seconds, &mseconds) != SA_OK)
        seconds = mseconds = 0;
    struct tm broken {
    };
    if (kviCsTimeGetGmTimeNoLogging(seconds, &broken) != SA_OK) {
        trio_snprintf(stamp.millis, sizeof stamp.millis, "%s", "MSTIME FAILED (1)");
        return;
    }
    if (strftime(stamp.date, STAMP_MAX_CHARS, "%Y/%m/%d %H:%M:%S", &broken) == 0)
        trio_snprintf(stamp.millis, sizeof stamp.millis, "%s", "MSTIME FAILED (2)");
    if (trio_snprintf(stamp.millis, STAMP_MAX_CHARS, "%3.3d", static_cast<int>(mseconds)) <= 0)
        trio_snprintf(stamp.millis, sizeof stamp.millis, "%s", "MSTIME FAILED (3)");
    stamp.date[STAMP_BUFFER_SIZE - 1] = '\0';
    stamp.millis[STAMP_BUFFER_SIZE - 1] = '\0';
}

// Writes one formatted line while holding logSem; the caller has filtered.
SaErrorT writeLine(const char *file, SaHpiInt16T line, const char *func, SaHpiUint32T level,
                   SaHpiUint32T threadNum, const char *message, SaHpiInt16T messageLength)
{
    TimeStamp stamp;
    stampNow(stamp);
    LevelLabel label = labelFor(level);

    if (kviCsSemWaitNoLogging(&logSem, LOG_SEM_WAIT_MS) != SA_OK)
        return SA_ERR_HPI_ERROR;
    FILE *stream = logFileHandle.load();
    if (stream == nullptr) {
        if (kviCsSemPostNoLogging(&logSem) == SA_OK)
            return SA_ERR_HPI_ERROR;
        fputs("file handle is null in kviCsLogger.  Exiting", stderr);
        exit(1);
    }
    const char *marker = messageLength >= KVI_CS_MAX_LOG_STRING_LENGTH ? TRUNCATION_MARKER : "";
    auto written = static_cast<SaHpiInt16T>(
        fprintf(stream, "%s%s %3.3d %s.%s Pid:%d Tid:%x %s %s() #%d %s%s\n", marker, label.label,
                static_cast<int>(level), stamp.date, stamp.millis, static_cast<int>(getpid()),
                threadNum, file, func, static_cast<int>(line), label.prefix, message));
    fflush(stream);
    if (kviCsSemPostNoLogging(&logSem) != SA_OK)
        exit(1);
    return written < 0 ? SA_ERR_HPI_ERROR : SA_OK;
}
} // namespace

SaErrorT kviCsVLogger(const char *SourceFile, SaHpiInt16T LineNumber, const char *FunctionName,
                      SaHpiUint32T Level, const char *Message, va_list Args) noexcept
{
    if (Message == nullptr || FunctionName == nullptr || SourceFile == nullptr)
        return SA_ERR_HPI_INVALID_PARAMS;
    if (!SemIsInitialized.load(std::memory_order_acquire))
        return SA_ERR_HPI_ERROR;
    if (!kviCsLogWanted(Level))
        return SA_OK;
    SaHpiUint32T threadNum = 0;
    if (kviCsThreadNum(&threadNum) != SA_OK)
        threadNum = static_cast<SaHpiUint32T>(-1);
    SaHpiUint32T level = normaliseLevel(Level);

    char message[KVI_CS_MAX_LOG_STRING_LENGTH];
    auto length = static_cast<SaHpiInt16T>(trio_vsnprintf(message, sizeof message, Message, Args));
    message[sizeof message - 1] = '\0';
    return writeLine(SourceFile, LineNumber, FunctionName, level, threadNum, message, length);
}

extern "C" {

KVI_EXPORT SaErrorT kviCsLogger(const char *SourceFile, SaHpiInt16T LineNumber,
                                const char *FunctionName, SaHpiUint32T Level, const char *Message,
                                ...) noexcept
{
    va_list args;
    va_start(args, Message);
    SaErrorT rc = kviCsVLogger(SourceFile, LineNumber, FunctionName, Level, Message, args);
    va_end(args);
    return rc;
}

KVI_EXPORT SaErrorT kviCsLogInitialize(KviCsLogLevelSettingT LogLevel,
                                       const char *LogFileName) noexcept
{
    if (!validLevelNumber(LogLevel)) {
        fprintf(stderr,
                "ERROR: Internal Error #1001, unable to initialize logging.  Invalid log level "
                "of %d passed to kviCsLogInitialize.\n",
                static_cast<int>(LogLevel));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    kviCsCurrentLogLevel.store(LogLevel);
    if (LogFileName == nullptr) {
        fputs("ERROR: Internal Error #1002, unable to initialize logging. (No filename)\n", stderr);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    // The semaphore is created held; on later calls it is taken first, so the
    // file keeps exactly one writer whatever the order of open and close.
    if (!SemIsInitialized.load()) {
        SaErrorT rc = kviCsSemInitNoLogging(&logSem, 0);
        if (rc != SA_OK) {
            fprintf(stderr,
                    "ERROR: Internal Error #1003, unable to initialize logging.  Semaphore init "
                    "failed. %d\n",
                    rc);
            return SA_ERR_HPI_ERROR;
        }
        SemIsInitialized.store(true, std::memory_order_release);
    } else if (kviCsSemWaitNoLogging(&logSem, LOG_CLOSE_WAIT_MS) != SA_OK) {
        return SA_ERR_HPI_ERROR;
    }
    if (logFileHandle.load() != nullptr) {
        kviCsSemPostNoLogging(&logSem);
        fputs("ERROR: Internal Error #1005, unable to initialize logging.\n    (Filehandle already "
              "open)",
              stderr);
        return SA_ERR_HPI_DUPLICATE;
    }
    FILE *stream = fopen(LogFileName, "a");
    if (stream == nullptr) {
        int err = errno;
        kviCsSemPostNoLogging(&logSem);
        fprintf(stderr,
                "ERROR: Internal Error #1006, unable to initialize logging.\n       Cannot open "
                "file %s, %s",
                LogFileName, strerror(err));
        return SA_ERR_HPI_ERROR;
    }
    logFileHandle.store(stream);
    SaErrorT rc = kviCsSemPostNoLogging(&logSem);
    if (rc != SA_OK) {
        fprintf(stderr,
                "ERROR: Internal Error #1007, unable to initialize logging.  Semaphore post "
                "failed. %d\n",
                rc);
        return SA_ERR_HPI_ERROR;
    }
    fputs("\n\n\n", stream);
    rc = KVI_ILOG(KVI_LOG_INFO, "%s", "");
    if (rc != SA_OK) {
        fprintf(stderr, "ERROR: Internal Error #1008, Unknown Error. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    KVI_ILOG(KVI_LOG_INFO, "**********************************");
    KVI_ILOG(KVI_LOG_INFO, "** Logging has been initialized **");
    KVI_ILOG(KVI_LOG_INFO, "**********************************");
    KVI_ILOG(KVI_LOG_INFO, "%s", "");
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsLogClose(void) noexcept
{
    if (logFileHandle.load() == nullptr)
        return SA_ERR_HPI_INVALID_REQUEST;
    if (kviCsSemWaitNoLogging(&logSem, LOG_CLOSE_WAIT_MS) != SA_OK)
        return SA_ERR_HPI_ERROR;
    FILE *stream = logFileHandle.exchange(nullptr);
    if (stream == nullptr) {
        kviCsSemPostNoLogging(&logSem);
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    // A stream whose close failed is gone all the same; keeping its handle
    // would let the next line write through a freed stream.
    bool closed = fclose(stream) == 0;
    if (kviCsSemPostNoLogging(&logSem) != SA_OK)
        return SA_ERR_HPI_ERROR;
    return closed ? SA_OK : SA_ERR_HPI_ERROR;
}

KVI_EXPORT SaErrorT kviCsSetLogLevel(KviCsLogLevelSettingT LogLevel) noexcept
{
    if (!validLevelNumber(LogLevel)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid log level of %d passed to kviCsSetLogLevel",
                 static_cast<int>(LogLevel));
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    kviCsCurrentLogLevel.store(LogLevel);
    return SA_OK;
}

} // extern "C"

void kviCsFatalRelease(const KviCallSite &site, const char *what, SaErrorT rc) noexcept
{
    kviCsLogger(site.file, static_cast<SaHpiInt16T>(site.line), site.func, KVI_LOG_ERR_FATAL_NUM,
                "%s on %s returned %d", what, site.text, rc);
    exit(1);
}
