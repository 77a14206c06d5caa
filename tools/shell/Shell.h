/* The shell's state, its command table and the argument parsers that the
 * commands share. A command gets its words after its own name and returns
 * false when it failed (bad input or an HPI result other than SA_OK), which
 * makes a scripted run end with a non-zero status. */
#ifndef KVI_SHELL_SHELL_H
#define KVI_SHELL_SHELL_H

#include <string>
#include <vector>

#include "SaHpi.h"

#ifndef KVI_SIM_HOT_SWAP_DRIVE
#define KVI_SIM_HOT_SWAP_DRIVE "kviSimHotSwapDrive"
typedef SaErrorT (*KviSimHotSwapDriveT)(const SaHpiEntityPathT *Entity, SaHpiBoolT Insert);
#endif

typedef SaErrorT (*KviShellSimDriveT)(SaHpiResourceIdT, SaHpiSensorNumT, SaHpiBoolT, SaHpiUint32T);

struct KviShellT {
    SaHpiSessionIdT Session = 0;
    bool Remote = false;
    const char *ConfigFile = nullptr;
    KviShellSimDriveT SimDrive = nullptr;
    KviSimHotSwapDriveT SimHotSwap = nullptr;
};

using KviShellArgsT = std::vector<std::string>;

struct KviShellCommandT {
    const char *Name; // one or two words
    int MinArgs;
    int MaxArgs;
    const char *Usage;
    const char *Help;
    bool (*Run)(KviShellT &Shell, const KviShellArgsT &Args);
};

/* The command groups, each a table of its own, joined by the dispatcher. */
extern const KviShellCommandT kviShellResourceCommands[];
extern const KviShellCommandT kviShellServiceCommands[];
extern const KviShellCommandT kviShellSessionCommands[];

/* Runs one line; returns false when it failed. Quit sets *Quit. */
bool kviShellRunLine(KviShellT &Shell, const std::string &Line, bool *Quit);
void kviShellHelp(FILE *Out);
/* Names for completion: the commands' words, then the resource ids. */
std::vector<std::string> kviShellCommandWords(const std::string &FirstWord);
std::vector<std::string> kviShellResourceWords(KviShellT &Shell);

/* Argument parsers: each prints one line naming the fault and returns false. */
bool kviShellNumber(const std::string &Arg, long long Min, long long Max, long long *Value,
                    const char *What);
bool kviShellName(const std::string &Arg, const struct KviShellNameTableT &Table, long long *Value,
                  const char *What);
/* A resource by id or by entity path; it must be in the RPT. */
bool kviShellResource(KviShellT &Shell, const std::string &Arg, SaHpiResourceIdT *Rid,
                      SaHpiRptEntryT *Entry = nullptr);
/* The record of Type numbered Num on Rid; it must exist. */
bool kviShellRecord(KviShellT &Shell, SaHpiResourceIdT Rid, SaHpiRdrTypeT Type,
                    const std::string &Num, SaHpiRdrT *Rdr);
/* A record's number (sensor, control, inventory or watchdog), whatever its type. */
SaHpiUint8T kviShellRecordNum(const SaHpiRdrT &Rdr);
/* Prints the result line when Rc is not SA_OK, or when Always. */
bool kviShellCheck(const char *Call, SaErrorT Rc, bool Always = false);

/* Host: start and stop HPI in the shell's process or through the client. */
bool kviShellStart(KviShellT &Shell, const char *Remote);
bool kviShellStop(KviShellT &Shell);
bool kviShellDiscover(KviShellT &Shell);

#endif
