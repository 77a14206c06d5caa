/* Printers of HPI types: one per type, each writing what a person reads
 * (names for enumerations, text for text buffers, dates for times, units
 * after numbers) to standard output. */
#ifndef KVI_SHELL_PRINTERS_H
#define KVI_SHELL_PRINTERS_H

#include <string>

#include "SaHpi.h"

std::string kviShellErrorName(SaErrorT Rc);
/* "saHpiX: SA_ERR_HPI_..." for a call's result. */
void kviShellPrintResult(const char *Call, SaErrorT Rc);

std::string kviShellText(const SaHpiTextBufferT &Text);
void kviShellTextSet(SaHpiTextBufferT *Text, const char *Value);
std::string kviShellTime(SaHpiTimeT Time);
std::string kviShellEntityPath(const SaHpiEntityPathT &Path);
/* Parses the form kviShellEntityPath prints: {TYPE,INSTANCE}... root first. */
bool kviShellEntityPathParse(const char *Text, SaHpiEntityPathT *Path);
std::string kviShellCapabilities(SaHpiCapabilitiesT Capabilities);
std::string kviShellEventStates(SaHpiEventStateT States, SaHpiEventCategoryT Category);
/* A reading's value: interpreted with units when present, raw otherwise. */
std::string kviShellReading(const SaHpiSensorReadingT &Reading, const SaHpiRdrT *Sensor);

void kviShellPrintRptHeader();
void kviShellPrintRptRow(const SaHpiRptEntryT &Entry);
void kviShellPrintRptEntry(const SaHpiRptEntryT &Entry);
void kviShellPrintRdrHeader();
void kviShellPrintRdrRow(const SaHpiRdrT &Rdr);
void kviShellPrintRdr(const SaHpiRdrT &Rdr);
void kviShellPrintThresholds(const SaHpiSensorThresholdsT &Thresholds, const SaHpiRdrT &Sensor);
void kviShellPrintCtrlState(const SaHpiCtrlStateT &State);
void kviShellPrintInventory(const SaHpiInventoryDataT &Data);
void kviShellPrintWatchdog(const SaHpiWatchdogT &Watchdog);
void kviShellPrintSelInfo(const SaHpiSelInfoT &Info);
void kviShellPrintEvent(const SaHpiEventT &Event, const SaHpiRdrT *Rdr, const SaHpiRptEntryT *Rpt);

#endif
