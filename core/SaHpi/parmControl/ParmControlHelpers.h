// Private shapes shared by the parameter-control units: the key builders,
// the reading of a saved item for a restore, the walk over a resource's
// records, and the functions that apply a saved sensor or control setting
// through a record's function table. Nothing here is exported.
#pragma once

#include <cstdio>
#include <cstring>
#include <type_traits>

#include "KviDaemonCore.h"
#include "core/utils/KviTrace.h"

// Keys of resource-level and record-level settings: prefix, flag digit,
// domain id, resource id and, for a record, its 8-bit number, in lower-case
// hex. The longest ("kviSavFru " form) is 29 characters, the store's limit.
#define KVI_CREATE_NV_PARMCTRL_KEY_RPT(Key, Prefix, Flag, DomainId, ResourceId)                    \
    do {                                                                                           \
        snprintf((Key), KVI_MAX_NV_KEY_LENGTH, "%s%d%8.8x%8.8x", (Prefix), (Flag) ? 1 : 0,         \
                 static_cast<unsigned>(DomainId), static_cast<unsigned>(ResourceId));              \
        KVI_DLOG(KVI_LOG_DBG_L, "%s key: %s", (Prefix), (Key));                                    \
    } while (0)

#define KVI_CREATE_NV_PARMCTRL_KEY_RDR(Key, Prefix, Flag, DomainId, ResourceId, Num)               \
    do {                                                                                           \
        snprintf((Key), KVI_MAX_NV_KEY_LENGTH, "%s%d%8.8x%8.8x%2.2x", (Prefix), (Flag) ? 1 : 0,    \
                 static_cast<unsigned>(DomainId), static_cast<unsigned>(ResourceId),               \
                 static_cast<unsigned>(static_cast<SaHpiUint8T>(Num)));                            \
        KVI_DLOG(KVI_LOG_DBG_L, "%s key: %s", (Prefix), (Key));                                    \
    } while (0)

// Reads the resource tag saved under Key. A read shorter than a whole text
// buffer is what the store holds (only the used part is saved); it must
// agree with the stored DataLength, else the disagreement is logged at
// MismatchLevel and SA_ERR_HPI_DATA_TRUNCATED returned. A missing key is
// SA_ERR_HPI_NOT_PRESENT, logged only when LogMissing is true.
SaErrorT kviCsReadResTagNV(const char *Key, bool LogMissing, SaHpiUint32T MismatchLevel,
                           SaHpiTextBufferT *ResourceTag) noexcept;

// How a restore answers the read of one saved item.
struct KviRestoreTextsT {
    const char *Missing;  // nothing saved, on an explicit restore
    SaErrorT MissingRc;   // ... and its result
    const char *Failed;   // any other failure of the read (may carry one %d: the code)
    bool FailedKeepsCode; // return the read's own code rather than SA_ERR_HPI_ERROR
};

// The result of a restore after reading one item with ReadRc. SA_OK with
// *Found false means nothing was saved and a daemon restore passes over the
// item; an explicit restore fails instead.
SaErrorT kviCsRestoreReadResult(SaErrorT ReadRc, SaHpiBoolT IsDaemonRestore,
                                const KviRestoreTextsT &Texts, bool *Found) noexcept;

// One record of a resource as the walk hands it out.
struct KviRdrVisitT {
    SaHpiRdrT Rdr;
    KviDsRdrFnTable FnTable;
    void *UserData;
    SaHpiBoolT Active;
};
typedef SaErrorT (*KviRdrVisitFnT)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   KviRdrVisitT *Record, void *Context);

// Calls Visit for every active record of the resource, from the first entry
// on; records of an inactive resource are logged with InactiveText and
// passed over. A resource without records is fine. The first failure, of the
// lookup or of Visit, ends the walk and is returned.
SaErrorT kviCsRdrWalk(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                      const char *InactiveText, KviRdrVisitFnT Visit, void *Context) noexcept;

// The resource capabilities the event-enable slots receive, from the active
// RPT entry; SA_ERR_HPI_ERROR when the entry cannot be had.
SaErrorT kviCsSensorCapabilities(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiCapabilitiesT *Capabilities) noexcept;

// Writes saved thresholds through SensorThresholdsSet, after clearing every
// threshold the record does not declare writable (a plug-in must not be
// asked to write a fixed one). SA_ERR_HPI_ERROR on any failure.
SaErrorT kviCsApplySensorThresholds(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData,
                                    SaHpiSensorThresholdsT *Thresholds) noexcept;

// Writes saved event enables through SensorEventEnablesSet. SA_ERR_HPI_ERROR
// on any failure.
SaErrorT kviCsApplySensorEventEnables(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData,
                                      SaHpiSensorEvtEnablesT *Enables) noexcept;

// Writes a control state through ControlStateSet. An empty slot returns
// NullSlotRc (the defaults and the restore answer it differently); a failing
// set SA_ERR_HPI_ERROR.
SaErrorT kviCsApplyCtrlState(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                             KviDsRdrFnTable *FnTable, void *UserData, SaHpiCtrlStateT *State,
                             SaErrorT NullSlotRc) noexcept;

// The domain's auto-insert timeout in the store: saved and read like the
// resource settings, under a key of the domain alone.
SaErrorT kviCsSaveAutoInsertTimeoutNV(SaHpiDomainIdT DomainId, SaHpiBoolT IsDaemonSave,
                                      SaHpiTimeoutT Timeout) noexcept;
SaErrorT kviCsGetAutoInsertTimeoutNV(SaHpiDomainIdT DomainId, SaHpiBoolT IsDaemonSave,
                                     SaHpiTimeoutT *Timeout) noexcept;
