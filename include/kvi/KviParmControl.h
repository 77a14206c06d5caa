/* Parameter control: restoring the defaults of a resource and its records,
 * saving their current settings in the non-volatile store, and putting the
 * saved settings back, on request (saHpiParmControl) or when the daemon
 * starts again (kviCsDaemonRestoreDomain).
 *
 * Saved settings are kept under keys made of a prefix, a one-digit flag, the
 * domain id and the resource id (8 lower-case hex digits each) and, for the
 * settings of a record, the record's number (2 hex digits). Flag 1 is the
 * daemon's own copy, written whenever an HPI call changes a setting and put
 * back at daemon start; flag 0 is the copy of an explicit SAHPI_SAVE_PARM,
 * put back by SAHPI_RESTORE_PARM. The two copies are independent.
 *
 * The Rpt and Rdr functions below are ready-made implementations of the
 * parameter-control slots of the plug-in function tables (KviMaplInterface.h):
 *   RptSaveParmControl     kviCsRptSaveParmControl
 *   RptRestoreParmControl  kviCsRptRestoreParmControl
 *   RdrDefaultParmControl  kviCsRestoreControlDefaults (control records)
 *   RdrSaveParmControl     kviCsRdrSaveSensorParmControl / kviCsRdrSaveCtrlParmControl
 *   RdrRestoreParmControl  kviCsRdrRestoreSensor / kviCsRdrRestoreCtrl
 * Every function returns SA_OK or an SA_ERR_HPI_* code. */
#ifndef KVI_PARM_CONTROL_H
#define KVI_PARM_CONTROL_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviMaplInterface.h"

KVI_EXTERN_C_BEGIN

/* Key prefixes of the saved settings (part of the store's on-disk format). */
#define KVI_NVKEY_EVENT_LOG_ST_PREFIX "kviEvtLogSt"
#define KVI_NVKEY_RESOURCE_TAG_PREFIX "kviResTag"
#define KVI_NVKEY_RESOURCE_SEVERITY_PREFIX "kviResSev"
#define KVI_NVKEY_SENSOR_THRESH_PREFIX "kviThresh"
#define KVI_NVKEY_EVENT_ENABLE_PREFIX "kviEvtEnb"
#define KVI_NVKEY_CONTROL_STATE_PREFIX "kviCtlSte"
#define KVI_NVKEY_SAVE_FRU_PREFIX "kviSavFru "
/* A setting of the domain: its key is the prefix, the flag digit and the
 * domain id ("kviAutoIns100000000"); the value is the 8-byte timeout. */
#define KVI_NVKEY_AUTO_INSERT_TIMEOUT_PREFIX "kviAutoIns"

/* ---- One resource ---- */

/* Runs Action (SAHPI_DEFAULT_PARM, SAHPI_SAVE_PARM, SAHPI_RESTORE_PARM) on
 * the resource through FnTable, then on each of its records through the
 * records' own tables. Nothing is rolled back after a failure. */
KVI_API SaErrorT kviCsParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                  SaHpiParmActionT Action, KviDsRptFnTable *FnTable,
                                  void *UserDefined) KVI_NOEXCEPT;

/* Saves the event-log state (when the table can read it), the resource tag
 * and the severity under flag 0. */
KVI_API SaErrorT kviCsRptSaveParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         KviDsRptFnTable *FnTable, void *UserDefined) KVI_NOEXCEPT;

/* Puts back the tag and the event-log state of the copy DaemonRestore names
 * and the severity of the flag-0 copy. A daemon restore passes over what was
 * never saved; an explicit restore fails on it. */
KVI_API SaErrorT kviCsRptRestoreParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            KviDsRptFnTable *FnTable, void *UserDefined,
                                            SaHpiBoolT DaemonRestore) KVI_NOEXCEPT;

/* Runs Action on every control, sensor and inventory record of the resource
 * through the record's parameter-control slots; the first failure ends it. */
KVI_API SaErrorT kviCsRdrPerformParmAction(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                           SaHpiParmActionT Action) KVI_NOEXCEPT;

/* ---- Sensor records ---- */

/* Saves the thresholds of a threshold sensor and the event enables of a
 * sensor with events, under flag 0. */
KVI_API SaErrorT kviCsRdrSaveSensorParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                               SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                                               void *UserData) KVI_NOEXCEPT;

/* Puts back the thresholds (of the copy IsDaemonRestore names; only those
 * the record declares writable) and the event enables (always the flag-0
 * copy). */
KVI_API SaErrorT kviCsRdrRestoreSensor(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
                                       KviDsRdrFnTable *FnTable, void *UserData) KVI_NOEXCEPT;

/* ---- Control records ---- */

/* Sets the control to the default state its record declares. */
KVI_API SaErrorT kviCsRestoreControlDefaults(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                             SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                                             void *UserData) KVI_NOEXCEPT;

/* Saves the control's current state under flag 0 (all lines of a text
 * control). */
KVI_API SaErrorT kviCsRdrSaveCtrlParmControl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                             SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                                             void *UserData) KVI_NOEXCEPT;

/* Puts back the saved state of the copy IsDaemonRestore names. */
KVI_API SaErrorT kviCsRdrRestoreCtrl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
                                     KviDsRdrFnTable *FnTable, void *UserData) KVI_NOEXCEPT;

/* ---- Save and get helpers ----
 * IsDaemonSave gives the key's flag digit (SAHPI_TRUE: 1). A get of a key
 * that was never saved returns SA_ERR_HPI_NOT_PRESENT. */

KVI_API SaErrorT kviCsSaveEvtLogStNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiBoolT IsDaemonSave, SaHpiBoolT Enable) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetEvtLogStNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiBoolT IsDaemonSave, SaHpiBoolT *Enable) KVI_NOEXCEPT;

/* Only the used part of the tag is stored (9 + DataLength bytes). */
KVI_API SaErrorT kviCsSaveResTagNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiBoolT IsDaemonSave,
                                   const SaHpiTextBufferT *ResourceTag) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetResTagNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                  SaHpiBoolT IsDaemonSave,
                                  SaHpiTextBufferT *ResourceTag) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsSaveResSeverityNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiBoolT IsDaemonSave,
                                        const SaHpiSeverityT *Severity) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetResSeverityNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiBoolT IsDaemonSave,
                                       SaHpiSeverityT *Severity) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsSaveThreshNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                   const SaHpiSensorThresholdsT *SensorThresholds) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetThreshNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                  SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                  SaHpiSensorThresholdsT *SensorThresholds) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsSaveEvtEnablesNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                       const SaHpiSensorEvtEnablesT *Enables) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetEvtEnablesNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                      SaHpiSensorEvtEnablesT *Enables) KVI_NOEXCEPT;

/* A text control keeps DataLength + 10 bytes of its state, any other the
 * whole state. */
KVI_API SaErrorT kviCsSaveCtrlStateNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiCtrlNumT CtrlNum, SaHpiBoolT IsDaemonSave,
                                      const SaHpiCtrlStateT *CtrlState) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetCtrlStateNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiCtrlNumT CtrlNum, SaHpiBoolT IsDaemonSave,
                                     SaHpiCtrlStateT *CtrlState) KVI_NOEXCEPT;

/* Inventory data: a length word (FruSize masked to 16 bits) and that many
 * bytes of FruBuffer. kviCsGetFruSizeNV reads the length word;
 * kviCsGetFruNV copies the saved bytes, at most FruSize of them
 * (SA_ERR_HPI_DATA_TRUNCATED when more were saved). */
KVI_API SaErrorT kviCsSaveFruNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiEirIdT EirId, SaHpiBoolT IsDaemonSave, SaHpiUint32T FruSize,
                                const void *FruBuffer) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetFruSizeNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiEirIdT EirId, SaHpiBoolT IsDaemonSave,
                                   SaHpiUint32T *FruSize) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetFruNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                               SaHpiEirIdT EirId, SaHpiBoolT IsDaemonSave, SaHpiUint32T FruSize,
                               void *FruBuffer) KVI_NOEXCEPT;

/* ---- Daemon restore ----
 * Puts back the settings that HPI calls changed before the daemon restarted
 * (the flag-1 copy). Call it after the plug-ins discovered their resources.
 * A setting that was never changed keeps what the plug-in reported. */

/* The domain's auto-insert timeout, then every active resource of the
 * domain; a failure of one does not stop the others. */
KVI_API SaErrorT kviCsDaemonRestoreDomain(SaHpiDomainIdT DomainId) KVI_NOEXCEPT;

/* One resource: tag, severity, then its sensors and controls. */
KVI_API SaErrorT kviCsParmControlDeamonRestore(SaHpiDomainIdT DomainId,
                                               SaHpiResourceIdT ResourceId) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsDeamonRestoreResourceTag(SaHpiDomainIdT DomainId,
                                               SaHpiResourceIdT ResourceId) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDeamonRestoreResourceSeverity(SaHpiDomainIdT DomainId,
                                                    SaHpiResourceIdT ResourceId) KVI_NOEXCEPT;

/* One record's setting, applied through the record's table. */
KVI_API SaErrorT kviCsDeamonRestoreSensorThresh(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId,
                                                SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                                KviDsRdrFnTable *FnTable,
                                                void *UserData) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDeamonRestoreEventEnables(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId,
                                                SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                                KviDsRdrFnTable *FnTable,
                                                void *UserData) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsDeamonRestoreCtrlState(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                             SaHpiCtrlNumT CtrlNum, SaHpiRdrT *Rdr,
                                             KviDsRdrFnTable *FnTable, void *UserData) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
