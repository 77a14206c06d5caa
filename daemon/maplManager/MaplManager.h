// The plug-in manager's table and the steps that the exported operations are
// made of; tests drive the steps directly.
#pragma once

#include "kvi/KviMaplInterface.h"
#include "kvi/KviMaplManager.h"

// One plug-in slot. NumLocks is fixed for every slot at start-up.
typedef struct {
    SaHpiBoolT InUse;
    SaHpiInt8T *FileName; // as listed in the configuration: the plug-in's identity
    KviMaplInitTableT *ModuleInitTable;
    void *LibraryHandle;
    SaHpiUint32T NumLocks;
    KviCsRwLockT *RwLockList; // NumLocks locks, created at registration
} KviDsMaplEntryT;

typedef struct {
    KviCsRwLockT MaplMasterLock;
    SaHpiUint32T MaxMapls;
    KviDsMaplEntryT *MaplList; // MaxMapls slots
} KviDsMaplManagerRepositoryT;

// Opens FileName, checks its KviMaplInitTable and registers it. The master
// lock is held for writing by the caller.
SaErrorT kviDsMaplManagerLoadMapl(const char *FileName) noexcept;

// Puts a checked plug-in into the lowest free slot and starts it; no free
// slot ends the process. The master lock is held for writing by the caller.
SaErrorT kviDsMaplManagerRegisterMapl(const char *FileName, void *LibraryHandle,
                                      KviMaplInitTableT *ModuleInitTable) noexcept;

// Waits for the calls running in the plug-in, removes its resources, stops
// and closes it and frees its slot. The master lock is held for writing by
// the caller.
SaErrorT kviDsMaplManagerUnloadMapl(SaHpiUint32T MaplNum) noexcept;

// Registered for configuration changes: brings the loaded set in line.
void kviDsMaplManagerConfigFileCallback(void) noexcept;
