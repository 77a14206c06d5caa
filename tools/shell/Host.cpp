/* Starting and stopping HPI: in the shell's own process as a daemon does,
 * or through the client library against a running daemon. */
#include <dlfcn.h>
#include <unistd.h>

#include <cstdio>

#include "HpiTable.h"
#include "KviDaemonCore.h"
#include "Printers.h"
#include "Shell.h"

namespace
{

// The simulator's controls, from the plug-ins that the configuration loaded.
void simulatorFind(KviShellT &Shell)
{
    char modules[1024] = "";
    Shell.SimDrive = nullptr;
    Shell.SimHotSwap = nullptr;
    if (kviCsCfgDataGet("mapl_modules", sizeof modules, modules, nullptr) != SA_OK)
        return;
    char path[512];
    for (SaHpiUint32T i = 0; kviGetListElement(i, modules, sizeof path, path) == SA_OK; i++) {
        void *handle = dlopen(path, RTLD_NOW | RTLD_NOLOAD);
        if (handle == nullptr)
            continue;
        if (Shell.SimDrive == nullptr)
            Shell.SimDrive =
                reinterpret_cast<KviShellSimDriveT>(dlsym(handle, "kviSimSensorReadingDrive"));
        if (Shell.SimHotSwap == nullptr)
            Shell.SimHotSwap =
                reinterpret_cast<KviSimHotSwapDriveT>(dlsym(handle, KVI_SIM_HOT_SWAP_DRIVE));
        dlclose(handle); // the library keeps its own reference
    }
}

// The library's one-time set-up in this process: configuration, log, redirector.
bool hostSetUp(KviShellT &Shell)
{
    static bool done = false;
    if (done)
        return true;
    SaErrorT rc = kviCsConfigInit(SAHPI_FALSE, Shell.ConfigFile);
    if (rc != SA_OK) {
        fprintf(stderr, "kvi-hpi-shell: cannot load the configuration %s: %s\n", Shell.ConfigFile,
                kviShellErrorName(rc).c_str());
        return false;
    }
    kviCsLogInitHelper("kvi-hpi-shell.log", "-l3");
    if (!kviShellCheck("kviDsApiRedirectorInitialize", kviDsApiRedirectorInitialize()))
        return false;
    done = true;
    return true;
}

} // namespace

bool kviShellDiscover(KviShellT &Shell)
{
    // Discovery of a large shelf takes a while; say what is going on.
    bool tty = isatty(fileno(stderr));
    if (tty)
        fprintf(stderr, "discovering resources...");
    SaErrorT rc = HPI(saHpiResourcesDiscover, Shell.Session);
    if (tty)
        fprintf(stderr, "\r%-26s\r", "");
    return kviShellCheck("saHpiResourcesDiscover", rc);
}

bool kviShellStart(KviShellT &Shell, const char *Remote)
{
    void *handle = RTLD_DEFAULT;
    if (Remote != nullptr) {
        Shell.Remote = true;
        if ((handle = kviShellClientLibraryOpen(Remote)) == nullptr)
            return false;
    } else if (!hostSetUp(Shell)) {
        return false;
    }
    kviShellHpiTableFill(&kviShellHpi, handle);
    SaHpiVersionT version = 0;
    if (!kviShellCheck("saHpiInitialize", HPI(saHpiInitialize, &version)) ||
        !kviShellCheck("saHpiSessionOpen",
                       HPI(saHpiSessionOpen, SAHPI_DEFAULT_DOMAIN_ID, &Shell.Session, nullptr)) ||
        !kviShellDiscover(Shell))
        return false;
    // An empty domain is most often a plug-in that did not load.
    SaHpiEntryIdT next;
    SaHpiRptEntryT first;
    if (HPI(saHpiRptEntryGet, Shell.Session, SAHPI_FIRST_ENTRY, &next, &first) != SA_OK)
        fprintf(stderr, "kvi-hpi-shell: no resources; check \"mapl_modules\" in the configuration "
                        "(a relative path is taken from the current directory)\n");
    if (Remote == nullptr) {
        // As a daemon does at start: put back what clients saved before.
        SaErrorT rc = kviCsDaemonRestoreDomain(SAHPI_DEFAULT_DOMAIN_ID);
        if (rc != SA_OK && rc != SA_ERR_HPI_NOT_PRESENT)
            kviShellPrintResult("kviCsDaemonRestoreDomain", rc);
        simulatorFind(Shell);
    }
    return true;
}

bool kviShellStop(KviShellT &Shell)
{
    HPI(saHpiSessionClose, Shell.Session);
    Shell.Session = 0;
    return kviShellCheck("saHpiFinalize", kviShellHpiCall(kviShellHpi.saHpiFinalize));
}
