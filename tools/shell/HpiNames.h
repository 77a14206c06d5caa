/* Names of the HPI enumerations: one table per type, value to name and back.
 * Values come from SaHpi.h itself, so a table cannot drift from the header. */
#ifndef KVI_SHELL_HPI_NAMES_H
#define KVI_SHELL_HPI_NAMES_H

#include <cstddef>

#include "SaHpi.h"

struct KviShellNameT {
    long long Value;
    const char *Name;
};

struct KviShellNameTableT {
    const KviShellNameT *Entries;
    size_t Count;
};

extern const KviShellNameTableT kviShellErrorNames;
extern const KviShellNameTableT kviShellEventCategoryNames;
/* Keyed by (category << 16 | state bit); kviShellEventStates reads it. */
extern const KviShellNameTableT kviShellEventStateNames;
extern const KviShellNameTableT kviShellEntityTypeNames;
extern const KviShellNameTableT kviShellSensorTypeNames;
extern const KviShellNameTableT kviShellSensorInterpretedTypeNames;
extern const KviShellNameTableT kviShellSensorUnitsNames;
extern const KviShellNameTableT kviShellCtrlTypeNames;
extern const KviShellNameTableT kviShellCtrlStateDigitalNames;
extern const KviShellNameTableT kviShellInventDataRecordTypeNames;
extern const KviShellNameTableT kviShellInventChassisTypeNames;
extern const KviShellNameTableT kviShellWatchdogActionNames;
extern const KviShellNameTableT kviShellWatchdogActionEventNames;
extern const KviShellNameTableT kviShellWatchdogPretimerInterruptNames;
extern const KviShellNameTableT kviShellWatchdogTimerUseNames;
extern const KviShellNameTableT kviShellRdrTypeNames;
extern const KviShellNameTableT kviShellHsPowerStateNames;
extern const KviShellNameTableT kviShellHsIndicatorStateNames;
extern const KviShellNameTableT kviShellHsActionNames;
extern const KviShellNameTableT kviShellHsStateNames;
extern const KviShellNameTableT kviShellSeverityNames;
extern const KviShellNameTableT kviShellEventTypeNames;
extern const KviShellNameTableT kviShellParmActionNames;
extern const KviShellNameTableT kviShellResetActionNames;
extern const KviShellNameTableT kviShellSelOverflowActionNames;

/* The name of Value, or NULL when the table has none. */
const char *kviShellNameOf(const KviShellNameTableT &Table, long long Value);
/* The value named Name (case-insensitive, with or without the SAHPI_ prefix). */
bool kviShellValueOf(const KviShellNameTableT &Table, const char *Name, long long *Value);

#endif
