/* Commands on the session itself: events, discovery, the restart of the
 * library, and the simulator's own controls. */
#include <cinttypes>
#include <csignal>
#include <cstdio>

#include "HpiTable.h"
#include "Printers.h"
#include "Shell.h"

namespace
{

volatile sig_atomic_t interrupted = 0;

void onInterrupt(int)
{
    interrupted = 1;
}

bool subscribe(KviShellT &Shell, const KviShellArgsT &Args)
{
    if (Args.size() == 1 && Args[0] != "alarms") {
        printf("events subscribe: \"%s\" is not \"alarms\"\n", Args[0].c_str());
        return false;
    }
    return kviShellCheck(
        "saHpiSubscribe",
        HPI(saHpiSubscribe, Shell.Session, Args.empty() ? SAHPI_FALSE : SAHPI_TRUE), true);
}

bool unsubscribe(KviShellT &Shell, const KviShellArgsT &)
{
    return kviShellCheck("saHpiUnsubscribe", HPI(saHpiUnsubscribe, Shell.Session), true);
}

// Prints events until COUNT have come, none came for TIMEOUT ms, or Ctrl-C.
// The wait is cut in slices so that an interrupt is seen within one.
bool events(KviShellT &Shell, const KviShellArgsT &Args)
{
    long long count = 0, timeoutMs = -1;
    if ((Args.size() > 0 && !kviShellNumber(Args[0], 0, INT32_MAX, &count, "count")) ||
        (Args.size() > 1 && !kviShellNumber(Args[1], 0, INT32_MAX, &timeoutMs, "timeout")))
        return false;
    interrupted = 0;
    struct sigaction action = {}, previous = {};
    action.sa_handler = onInterrupt;
    sigaction(SIGINT, &action, &previous);
    long long got = 0, waited = 0;
    const long long slice = 250;
    SaErrorT rc = SA_OK;
    while (!interrupted && (count == 0 || got < count) && (timeoutMs < 0 || waited < timeoutMs)) {
        long long wait = timeoutMs < 0 ? slice : std::min(slice, timeoutMs - waited);
        SaHpiEventT event;
        SaHpiRdrT rdr;
        SaHpiRptEntryT rpt;
        rc = HPI(saHpiEventGet, Shell.Session, static_cast<SaHpiTimeoutT>(wait) * 1000000, &event,
                 &rdr, &rpt);
        if (rc == SA_ERR_HPI_TIMEOUT) {
            waited += wait;
            rc = SA_OK;
            continue;
        }
        if (rc != SA_OK && rc != SA_ERR_HPI_DATA_TRUNCATED)
            break;
        waited = 0;
        kviShellPrintEvent(event, &rdr, &rpt);
        got++;
    }
    sigaction(SIGINT, &previous, nullptr);
    printf("%lld %s\n", got, got == 1 ? "event" : "events");
    return kviShellCheck("saHpiEventGet", rc) && (count == 0 || got == count);
}

bool simReady(KviShellT &Shell, bool HotSwap)
{
    if (Shell.Remote) {
        printf("sim: the simulator's controls are only at hand when the shell hosts the library\n");
        return false;
    }
    if ((HotSwap ? (void *)Shell.SimHotSwap : (void *)Shell.SimDrive) == nullptr) {
        printf("sim: the loaded plug-ins offer no %s\n",
               HotSwap ? KVI_SIM_HOT_SWAP_DRIVE : "kviSimSensorReadingDrive");
        return false;
    }
    return true;
}

bool simDrive(KviShellT &Shell, const KviShellArgsT &Args)
{
    SaHpiResourceIdT rid = 0;
    SaHpiRdrT rdr;
    long long raw = 0;
    bool release = Args[2] == "release";
    if (!simReady(Shell, false) || !kviShellResource(Shell, Args[0], &rid) ||
        !kviShellRecord(Shell, rid, SAHPI_SENSOR_RDR, Args[1], &rdr) ||
        (!release && !kviShellNumber(Args[2], 0, 255, &raw, "raw")))
        return false;
    return kviShellCheck("kviSimSensorReadingDrive",
                         Shell.SimDrive(rid, rdr.RdrTypeUnion.SensorRec.Num,
                                        release ? SAHPI_FALSE : SAHPI_TRUE,
                                        static_cast<SaHpiUint32T>(raw)),
                         true);
}

bool simHotSwap(KviShellT &Shell, const KviShellArgsT &Args, SaHpiBoolT Insert)
{
    SaHpiEntityPathT path;
    if (!simReady(Shell, true))
        return false;
    if (!kviShellEntityPathParse(Args[0].c_str(), &path)) {
        printf("sim: \"%s\" is not an entity path like {SYSTEM_CHASSIS,1}{PROCESSOR_BOARD,1}\n",
               Args[0].c_str());
        return false;
    }
    return kviShellCheck(KVI_SIM_HOT_SWAP_DRIVE, Shell.SimHotSwap(&path, Insert), true);
}

bool simPull(KviShellT &Shell, const KviShellArgsT &Args)
{
    return simHotSwap(Shell, Args, SAHPI_FALSE);
}

bool simInsert(KviShellT &Shell, const KviShellArgsT &Args)
{
    return simHotSwap(Shell, Args, SAHPI_TRUE);
}

bool discover(KviShellT &Shell, const KviShellArgsT &)
{
    return kviShellDiscover(Shell);
}

bool restart(KviShellT &Shell, const KviShellArgsT &)
{
    if (Shell.Remote) {
        printf("restart: only the shell's own library can be restarted\n");
        return false;
    }
    return kviShellStop(Shell) && kviShellStart(Shell, nullptr);
}

bool schema(KviShellT &Shell, const KviShellArgsT &)
{
    SaHpiUint32T id = 0;
    if (!kviShellCheck("saHpiEntitySchemaGet", HPI(saHpiEntitySchemaGet, Shell.Session, &id)))
        return false;
    printf("entity schema 0x%08" PRIX32 "\n", id);
    return true;
}

bool help(KviShellT &, const KviShellArgsT &)
{
    kviShellHelp(stdout);
    return true;
}

} // namespace

const KviShellCommandT kviShellSessionCommands[] = {
    {"events subscribe", 0, 1, "[alarms]", "receive events (with the active alarms)", subscribe},
    {"events get", 0, 2, "[COUNT [TIMEOUT_MS]]", "print events until COUNT, TIMEOUT or Ctrl-C",
     events},
    {"events unsubscribe", 0, 0, "", "stop receiving events", unsubscribe},
    {"discover", 0, 0, "", "discover resources again", discover},
    {"schema", 0, 0, "", "the domain's entity schema", schema},
    {"restart", 0, 0, "",
     "finalize and initialize the library in this process; resources get new ids, so settings "
     "kept under the old ids are not put back (a new shell run puts them back)",
     restart},
    {"sim drive", 3, 3, "RID NUM RAW|release", "make a simulated sensor read RAW", simDrive},
    {"sim pull", 1, 1, "ENTITY-PATH", "pull a simulated board", simPull},
    {"sim insert", 1, 1, "ENTITY-PATH", "insert a simulated board", simInsert},
    {"help", 0, 0, "", "this list", help},
    {nullptr, 0, 0, nullptr, nullptr, nullptr},
};
