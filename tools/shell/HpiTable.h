/* Every saHpi* call the shell makes goes through this table, so the same
 * commands serve the library hosted in the shell's own process and a remote
 * daemon reached through the client library. A call the table lacks (not
 * exported by the library at hand) is reported once per use as not served. */
#ifndef KVI_SHELL_HPI_TABLE_H
#define KVI_SHELL_HPI_TABLE_H

#include <cstddef>

#include "SaHpi.h"

#define KVI_SHELL_HPI_CALLS(X)                                                                     \
    X(saHpiInitialize)                                                                             \
    X(saHpiFinalize)                                                                               \
    X(saHpiSessionOpen)                                                                            \
    X(saHpiSessionClose)                                                                           \
    X(saHpiResourcesDiscover)                                                                      \
    X(saHpiRptInfoGet)                                                                             \
    X(saHpiRptEntryGet)                                                                            \
    X(saHpiRptEntryGetByResourceId)                                                                \
    X(saHpiResourceSeveritySet)                                                                    \
    X(saHpiResourceTagSet)                                                                         \
    X(saHpiResourceIdGet)                                                                          \
    X(saHpiEntitySchemaGet)                                                                        \
    X(saHpiEventLogInfoGet)                                                                        \
    X(saHpiEventLogEntryGet)                                                                       \
    X(saHpiEventLogEntryAdd)                                                                       \
    X(saHpiEventLogEntryDelete)                                                                    \
    X(saHpiEventLogClear)                                                                          \
    X(saHpiEventLogTimeGet)                                                                        \
    X(saHpiEventLogTimeSet)                                                                        \
    X(saHpiEventLogStateGet)                                                                       \
    X(saHpiEventLogStateSet)                                                                       \
    X(saHpiSubscribe)                                                                              \
    X(saHpiUnsubscribe)                                                                            \
    X(saHpiEventGet)                                                                               \
    X(saHpiRdrGet)                                                                                 \
    X(saHpiSensorReadingGet)                                                                       \
    X(saHpiSensorReadingConvert)                                                                   \
    X(saHpiSensorThresholdsGet)                                                                    \
    X(saHpiSensorThresholdsSet)                                                                    \
    X(saHpiSensorTypeGet)                                                                          \
    X(saHpiSensorEventEnablesGet)                                                                  \
    X(saHpiSensorEventEnablesSet)                                                                  \
    X(saHpiControlTypeGet)                                                                         \
    X(saHpiControlStateGet)                                                                        \
    X(saHpiControlStateSet)                                                                        \
    X(saHpiEntityInventoryDataRead)                                                                \
    X(saHpiEntityInventoryDataWrite)                                                               \
    X(saHpiWatchdogTimerGet)                                                                       \
    X(saHpiWatchdogTimerSet)                                                                       \
    X(saHpiWatchdogTimerReset)                                                                     \
    X(saHpiHotSwapControlRequest)                                                                  \
    X(saHpiResourceActiveSet)                                                                      \
    X(saHpiResourceInactiveSet)                                                                    \
    X(saHpiAutoInsertTimeoutGet)                                                                   \
    X(saHpiAutoInsertTimeoutSet)                                                                   \
    X(saHpiAutoExtractTimeoutGet)                                                                  \
    X(saHpiAutoExtractTimeoutSet)                                                                  \
    X(saHpiHotSwapStateGet)                                                                        \
    X(saHpiHotSwapActionRequest)                                                                   \
    X(saHpiResourcePowerStateGet)                                                                  \
    X(saHpiResourcePowerStateSet)                                                                  \
    X(saHpiHotSwapIndicatorStateGet)                                                               \
    X(saHpiHotSwapIndicatorStateSet)                                                               \
    X(saHpiParmControl)                                                                            \
    X(saHpiResourceResetStateGet)                                                                  \
    X(saHpiResourceResetStateSet)

struct KviShellHpiTableT {
#define KVI_SHELL_HPI_SLOT(name) decltype(&::name) name;
    KVI_SHELL_HPI_CALLS(KVI_SHELL_HPI_SLOT)
#undef KVI_SHELL_HPI_SLOT
};

/* Fills every slot from Handle (RTLD_DEFAULT for the library linked into the
 * shell); returns how many calls were found. */
int kviShellHpiTableFill(KviShellHpiTableT *Table, void *Handle);

/* Remote mode: points the client library at Server (host:port) through its
 * environment variables and loads it, from $KVI_HPI_CLIENT_LIB when set.
 * Returns the handle, or NULL after one line on stderr naming the fault. */
void *kviShellClientLibraryOpen(const char *Server);

/* Splits "host:port" into its parts; false (and nothing written) when the
 * text is not of that form or the port is not a number from 1 to 65535. */
bool kviShellServerSplit(const char *Server, char *Host, size_t HostSize, char *Port,
                         size_t PortSize);

/* The last call that the table could not serve, for the result line. */
extern bool kviShellHpiUnserved;

/* Calls Name through Slot; a missing slot answers SA_ERR_HPI_UNSUPPORTED_API. */
template <class FnT, class... ArgsT> SaErrorT kviShellHpiCall(FnT *Slot, ArgsT... Args)
{
    kviShellHpiUnserved = Slot == nullptr;
    return Slot == nullptr ? SA_ERR_HPI_UNSUPPORTED_API : Slot(Args...);
}

/* The shell's calls: HPI(saHpiRdrGet, Session, ...) against the table in use. */
extern KviShellHpiTableT kviShellHpi;
#define HPI(name, ...) kviShellHpiCall(kviShellHpi.name, __VA_ARGS__)

#endif
