// Start-up of logging from a command-line style option string such as
// "-l3 -lf -ls": a compulsory numeric level and optional categories.
#include <cstdio>

#include "core/utils/KviTrace.h"
#include "kvi/KviLogging.h"

namespace
{
constexpr KviCsLogLevelSettingT FUNCTION_TRACE_FLAGS = KVI_LOG_FUNC_IN_NUM | KVI_LOG_FUNC_OUT_NUM;

// Returns false when the string is invalid; *sawOption tells whether any
// option was read at all.
bool parseLogOptions(const char *options, KviCsLogLevelSettingT *level, bool *sawOption)
{
    int lastDigit = -1;
    *level = 0;
    *sawOption = false;
    for (const char *p = options; p != nullptr && *p != '\0';) {
        if (*p == ' ') {
            ++p;
            continue;
        }
        if (p[0] != '-' || p[1] != 'l' || p[2] == '\0')
            return false;
        char code = p[2];
        if (code >= '0' && code <= '9') {
            lastDigit = code - '0';
            *level = (*level & ~static_cast<KviCsLogLevelSettingT>(KVI_LOG_NUM_MASK)) |
                     static_cast<KviCsLogLevelSettingT>(lastDigit);
        } else if (code == 'f') {
            *level |= FUNCTION_TRACE_FLAGS;
        } else if (code == 'm') {
            *level |= KVI_LOG_MEM_NUM;
        } else if (code == 's') {
            *level |= KVI_LOG_SEM_NUM;
        } else {
            return false;
        }
        *sawOption = true;
        p += 3;
    }
    return lastDigit >= KVI_LOG_MIN && lastDigit <= KVI_LOG_MAX;
}
} // namespace

extern "C" KVI_EXPORT void kviCsLogInitHelper(const char *LogFileName, const char *LogLevel) noexcept
{
    if (LogFileName == nullptr)
        return;
    KviCsLogLevelSettingT level = 0;
    bool sawOption = false;
    bool valid = parseLogOptions(LogLevel, &level, &sawOption);
    if (!valid || !sawOption)
        level = DEFAULT_LOG_LEVEL;
    if (kviCsLogInitialize(level, LogFileName) != SA_OK) {
        fputs("\nFailed to initialize logging. Logging disabled.\n", stderr);
        return;
    }
    if (!valid)
        KVI_WLOG(KVI_LOG_WARN,
                 "Invalid logging options specified: \"%s\". Using default logging level.",
                 LogLevel != nullptr ? LogLevel : "(null)");
}
