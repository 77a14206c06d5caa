/* The process-wide log file: levels, call macros and the logger. */
#ifndef KVI_LOGGING_H
#define KVI_LOGGING_H

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

/* Low nibble: threshold level 1..6; bits above it: independent categories. */
typedef SaHpiUint32T KviCsLogLevelSettingT;

#define KVI_LOG_NUM_MASK 0x0F
#define KVI_LOG_INVALID_NUM 0
#define KVI_LOG_DBG_L_NUM 1
#define KVI_LOG_DBG_H_NUM 2
#define KVI_LOG_INFO_NUM 3
#define KVI_LOG_WARN_NUM 4
#define KVI_LOG_ERR_NONFATAL_NUM 5
#define KVI_LOG_ERR_FATAL_NUM 6
#define KVI_LOG_MEM_NUM 0x10
#define KVI_LOG_FUNC_IN_NUM 0x20
#define KVI_LOG_FUNC_OUT_NUM 0x40
#define KVI_LOG_SEM_NUM 0x80

#define KVI_LOG_MIN 1
#define KVI_LOG_MAX 6
#define DEFAULT_LOG_LEVEL KVI_LOG_INFO_NUM
#define KVI_CS_MAX_LOG_STRING_LENGTH 2048
#define KVI_LOG_MAX_LOG_TAG_LENGTH 20
#define KVI_DEFAULT_LOG_FILENAME "sahpi.log"
#define KVI_CS_CLIENT_LOG_FILENAME_ENV "KVI_LIB_LOG_LOCATION"

#define KVI_LOG_ERROR_STRING "Error   "
#define KVI_LOG_INFO_STRING "  Info  "
#define KVI_LOG_WARNING_STRING " Warn   "
#define KVI_LOG_DEBUG_STRING "  Debug "
#define KVI_LOG_MEM_STRING "    Mem "
#define KVI_LOG_SEM_STRING "    Sem "
#define KVI_LOG_FUNC_IN_STRING "   +In  "
#define KVI_LOG_FUNC_OUT_STRING "   -Out "
#define KVI_LOG_INVALID_STRING "INVALID ERROR LEVEL"
#define KVI_LOG_FUNCTION_ENTRY "Function entry: "
#define KVI_LOG_FUNCTION_EXIT "Function exit: "

/* Each level macro expands to the four leading arguments of kviCsLogger, so
 * every line names the file, line and function that wrote it. */
#define KVI_LOG_POSITION_(num) __FILE__, __LINE__, __func__, (num)
#define KVI_LOG_DBG_L KVI_LOG_POSITION_(KVI_LOG_DBG_L_NUM)
#define KVI_LOG_DBG_H KVI_LOG_POSITION_(KVI_LOG_DBG_H_NUM)
#define KVI_LOG_INFO KVI_LOG_POSITION_(KVI_LOG_INFO_NUM)
#define KVI_LOG_WARN KVI_LOG_POSITION_(KVI_LOG_WARN_NUM)
#define KVI_LOG_ERR_NONFATAL KVI_LOG_POSITION_(KVI_LOG_ERR_NONFATAL_NUM)
#define KVI_LOG_ERR_FATAL KVI_LOG_POSITION_(KVI_LOG_ERR_FATAL_NUM)
#define KVI_LOG_MEM KVI_LOG_POSITION_(KVI_LOG_MEM_NUM)
#define KVI_LOG_SEM KVI_LOG_POSITION_(KVI_LOG_SEM_NUM)
#define KVI_LOG_FUNC_IN KVI_LOG_POSITION_(KVI_LOG_FUNC_IN_NUM)
#define KVI_LOG_FUNC_OUT KVI_LOG_POSITION_(KVI_LOG_FUNC_OUT_NUM)

/* The names tell the reader what a line is; the level argument alone decides
 * filtering and labelling. Usage: KVI_ELOG(KVI_LOG_ERR_NONFATAL, "fmt", ...). */
#define KVI_ELOG kviCsLogger
#define KVI_WLOG kviCsLogger
#define KVI_ILOG kviCsLogger
#define KVI_DLOG kviCsLogger
#define KVI_FLOG kviCsLogger
#define KVI_MLOG kviCsLogger
#define KVI_SLOG kviCsLogger

KVI_API SaErrorT kviCsLogInitialize(KviCsLogLevelSettingT LogLevel,
                                    const char *LogFileName) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLogClose(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSetLogLevel(KviCsLogLevelSettingT LogLevel) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsLogger(const char *SourceFile, SaHpiInt16T LineNumber,
                             const char *FunctionName, SaHpiUint32T Level, const char *Message,
                             ...) KVI_NOEXCEPT __attribute__((format(printf, 5, 6)));
KVI_API void kviCsLogInitHelper(const char *LogFileName, const char *LogLevel) KVI_NOEXCEPT;

KVI_EXTERN_C_END

/* Inside the library a line below the level costs one compare: the level is
 * tested where the line is written, before any call or formatting. */
#if defined(__cplusplus) && defined(KVI_INLINE_LOG_FILTER)
#include <atomic>
extern std::atomic<KviCsLogLevelSettingT> kviCsCurrentLogLevel;
/* A level that mixes a threshold with category flags is never filtered. */
inline bool kviCsLogWanted(SaHpiUint32T Level) noexcept
{
    const SaHpiUint32T num = Level & KVI_LOG_NUM_MASK;
    const SaHpiUint32T flags = Level & ~static_cast<SaHpiUint32T>(KVI_LOG_NUM_MASK);
    if (num != 0 && flags != 0)
        return true;
    const KviCsLogLevelSettingT current = kviCsCurrentLogLevel.load(std::memory_order_relaxed);
    if (num != 0 && num < (current & KVI_LOG_NUM_MASK))
        return false;
    return flags == 0 || (flags & current) != 0;
}
#define KVI_LOG_FILTERED_(File, Line, Func, Level, ...)                                            \
    (kviCsLogWanted(Level) ? kviCsLogger(File, Line, Func, Level, __VA_ARGS__) : SA_OK)
#define KVI_LOG_INLINE_(...) KVI_LOG_FILTERED_(__VA_ARGS__)
#undef KVI_ELOG
#undef KVI_WLOG
#undef KVI_ILOG
#undef KVI_DLOG
#undef KVI_FLOG
#undef KVI_MLOG
#undef KVI_SLOG
#define KVI_ELOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#define KVI_WLOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#define KVI_ILOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#define KVI_DLOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#define KVI_FLOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#define KVI_MLOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#define KVI_SLOG(...) KVI_LOG_INLINE_(__VA_ARGS__)
#endif

#endif
