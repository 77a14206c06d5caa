// The front end's own checks, shared with its tests: the lookup of the
// record a call addresses and the validation of what a client asks a plug-in
// to set. None of these is exported.
#pragma once

#include "SaHpi.h"
#include "kvi/KviMaplInterface.h"

// The record of type RdrType and number MiNum (sensor, control, inventory or
// watchdog number) of an active resource, with everything needed to call its
// plug-in.
SaErrorT getActiveRdr(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId, SaHpiUint8T MiNum,
                      SaHpiRdrTypeT RdrType, SaHpiRdrT *Rdr, SaHpiDomainIdT *DomainId,
                      void **UserData, KviDsRdrFnTable *FnTable, SaHpiUint32T *MaplNum,
                      KviCsRwLockT **MaplLock) noexcept;

// A control state against the control's record.
SaErrorT validateControlState(SaHpiRdrT *CtrlRdr, SaHpiCtrlStateT *CtrlState) noexcept;

// Sensor event enables against the sensor's event category.
SaErrorT validateEvtEnables(SaHpiSensorEvtEnablesT *Enables, SaHpiEventCategoryT Category) noexcept;

// The fields of a watchdog a client asks to set.
SaErrorT validateWatchdog(const SaHpiWatchdogT *Watchdog) noexcept;
