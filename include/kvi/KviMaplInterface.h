/* The calling contract between the library and its plug-in libraries (MAPLs).
 *
 * A plug-in exports one object, KviMaplInitTable, through which the plug-in
 * manager checks its interface version, starts and stops it and asks it to
 * discover resources. For every resource and every record it adds, the
 * plug-in hands over a table of functions; the front end serves the HPI calls
 * for that resource through them. The tables are copied by value when they
 * are registered, so one static table may serve many resources. */
#ifndef KVI_MAPL_INTERFACE_H
#define KVI_MAPL_INTERFACE_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviRwLock.h"

KVI_EXTERN_C_BEGIN

/* The only interface version the manager accepts; equality is required. */
#define KVI_MAPL_INTR_VERSION 0x00000101

/* ---- Initialisation table: the one symbol a plug-in exports ---- */

typedef SaErrorT (*KviMaplGetVersion)(SaHpiVersionT *Version);
typedef SaErrorT (*KviMaplInitialization)(SaHpiUint32T MaplNum);
typedef SaErrorT (*KviMaplFinalization)(void);
typedef SaErrorT (*KviMaplDiscovery)(SaHpiDomainIdT DomainId);

/* None of the four may be NULL. MaplInitialization receives the plug-in's
 * slot number, which it passes back when it adds RPT entries. */
typedef struct __KviMaplInitTableT {
    KviMaplGetVersion GetVersion;
    KviMaplInitialization MaplInitialization;
    KviMaplFinalization MaplFinalization;
    KviMaplDiscovery ResourcesDiscover;
} KviMaplInitTableT;

/* ---- Per-resource function table ----
 * Every slot receives the domain and resource id first and the UserDefined
 * pointer registered with the RPT entry. Slots that serve a redirected call
 * may be NULL: the call is then refused with SA_ERR_HPI_INVALID_CMD. The
 * hot-swap slots are called only for resources whose RPT entry carries
 * SAHPI_CAPABILITY_FRU (the state read) or SAHPI_CAPABILITY_FRU and
 * SAHPI_CAPABILITY_MANAGED_HOTSWAP (the others); a hot-swap slot reports a
 * request that the resource's present state does not allow with
 * SA_ERR_HPI_INVALID_REQUEST. */

typedef struct __KviDsRptFnTable KviDsRptFnTable;

typedef SaErrorT (*KviDsRptEntryResourcesRemove)(SaHpiDomainIdT DomainId,
                                                 SaHpiResourceIdT ResourceId,
                                                 SaHpiRptEntryT *RptEntry, void *UserDefined,
                                                 SaHpiBoolT Active, KviDsRptFnTable *FnTable);
typedef SaErrorT (*KviDsSaveRptParmCtrl)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         KviDsRptFnTable *FnTable, void *UserDefined);
typedef SaErrorT (*KviDsRestoreRptParmCtrl)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            KviDsRptFnTable *FnTable, void *UserDefined,
                                            SaHpiBoolT IsDaemonRestore);

struct __KviDsRptFnTable {
    /* 1-9: event log, served by saHpiEventLog* */
    SaErrorT (*EventLogInfoGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                void *UserDefined, SaHpiSelInfoT *Info);
    SaErrorT (*EventLogEntryGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiSelEntryIdT EntryId, void *UserDefined,
                                 SaHpiSelEntryIdT *PrevEntryId, SaHpiSelEntryIdT *NextEntryId,
                                 SaHpiSelEntryT *EventLogEntry, SaHpiRdrT *Rdr,
                                 SaHpiRptEntryT *RptEntry);
    SaErrorT (*EventLogEntryAdd)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiSelEntryT *EvtEntry, void *UserDefined);
    SaErrorT (*EventLogEntryDelete)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiSelEntryIdT EntryId, void *UserDefined);
    SaErrorT (*EventLogClear)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                              void *UserDefined);
    SaErrorT (*EventLogTimeGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                void *UserDefined, SaHpiTimeT *Time);
    SaErrorT (*EventLogTimeSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiTimeT Time, void *UserDefined);
    SaErrorT (*EventLogStateGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 void *UserDefined, SaHpiBoolT *Enable);
    SaErrorT (*EventLogStateSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiBoolT Enable, void *UserDefined);
    /* 10-16: hot swap, served by saHpiHotSwap*, saHpiResource(In)ActiveSet and
     * saHpiAutoExtractTimeout* */
    SaErrorT (*HotSwapControlRequest)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined);
    SaErrorT (*ResourceActiveSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                  void *UserDefined);
    SaErrorT (*ResourceInactiveSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    void *UserDefined);
    SaErrorT (*AutoExtractTimeoutGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiTimeoutT *Timeout);
    SaErrorT (*AutoExtractTimeoutSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiTimeoutT Timeout, void *UserDefined);
    SaErrorT (*HotSwapStateGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                void *UserDefined, SaHpiHsStateT *State);
    SaErrorT (*HotSwapActionRequest)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiHsActionT Action, void *UserDefined);
    /* 17-18: power, served by saHpiResourcePowerState* */
    SaErrorT (*ResourcePowerStateGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiHsPowerStateT *State);
    SaErrorT (*ResourcePowerStateSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiHsPowerStateT State, void *UserDefined);
    /* 19-20: hot-swap indicator, served by saHpiHotSwapIndicatorState* */
    SaErrorT (*HotSwapIndicatorStateGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         void *UserDefined, SaHpiHsIndicatorStateT *State);
    SaErrorT (*HotSwapIndicatorStateSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiHsIndicatorStateT State, void *UserDefined);
    /* 21-22: reset, served by saHpiResourceResetState* */
    SaErrorT (*ResourceResetStateGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      void *UserDefined, SaHpiResetActionT *ResetAction);
    SaErrorT (*ResourceResetStateSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiResetActionT ResetAction, void *UserDefined);
    /* 23: called when the entry is removed; frees what hangs on UserDefined */
    KviDsRptEntryResourcesRemove RptEntryResourcesRemove;
    /* 24-26: parameter control */
    SaErrorT (*RptDefaultParmControl)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId);
    KviDsSaveRptParmCtrl RptSaveParmControl;
    KviDsRestoreRptParmCtrl RptRestoreParmControl;
};

/* ---- Per-record function table ----
 * Every slot receives the domain and resource id first; UserData is the
 * pointer registered with the record. Slots 1-13 may be NULL (the call is
 * refused with SA_ERR_HPI_INVALID_CMD). */

typedef struct __KviDsRdrFnTable KviDsRdrFnTable;

typedef SaErrorT (*KviDsActiveAlarmTranslate)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                              SaHpiSensorNumT SensorNum, void *UserData,
                                              SaHpiRdrT *Rdr, SaHpiRptEntryT *RptEntry,
                                              SaHpiEventT *Event);
typedef SaErrorT (*KviDsRdrResourcesRemove)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            SaHpiRdrT *RdrEntry, void *UserData,
                                            KviDsRdrFnTable *FnTable);
typedef SaErrorT (*KviDsDefaultRdrParmCtrl)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable,
                                            void *UserData);
typedef SaErrorT (*KviDsSaveRdrParmCtrl)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiRdrT *Rdr, KviDsRdrFnTable *FnTable, void *UserData);
typedef SaErrorT (*KviDsRestoreRdrParmCtrl)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                            SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
                                            KviDsRdrFnTable *FnTable, void *UserData);

struct __KviDsRdrFnTable {
    /* 1-6: sensors */
    SaErrorT (*SensorReadingGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiSensorNumT SensorNum, SaHpiEventCategoryT Category,
                                 SaHpiRdrT *Rdr, void *UserData, SaHpiSensorReadingT *Reading);
    SaErrorT (*SensorReadingConvert)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                     SaHpiSensorReadingT *ReadingInput, void *UserData,
                                     SaHpiSensorReadingT *ConvertedReading);
    SaErrorT (*SensorThresholdsGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr, void *UserData,
                                    SaHpiSensorThresholdsT *SensorThresholds);
    SaErrorT (*SensorThresholdsSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                    SaHpiSensorNumT SensorNum, SaHpiRdrT *Rdr,
                                    SaHpiSensorThresholdsT *SensorThresholds, void *UserData);
    SaErrorT (*SensorEventEnablesGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, void *UserData,
                                      SaHpiCapabilitiesT Capabilities, SaHpiEventCategoryT Category,
                                      SaHpiSensorEvtEnablesT *Enables);
    SaErrorT (*SensorEventEnablesSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, SaHpiSensorEvtEnablesT *Enables,
                                      SaHpiRdrT *Rdr, SaHpiCapabilitiesT Capabilities,
                                      void *UserData);
    /* 7-8: controls */
    SaErrorT (*ControlStateGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiCtrlNumT CtrlNum, void *UserData, SaHpiCtrlStateT *CtrlState);
    SaErrorT (*ControlStateSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                SaHpiCtrlNumT CtrlNum, SaHpiCtrlStateT *CtrlState, void *UserData);
    /* 9-11: watchdogs */
    SaErrorT (*WatchdogTimerGet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiWatchdogNumT WatchdogNum, void *UserData,
                                 SaHpiWatchdogT *Watchdog);
    SaErrorT (*WatchdogTimerSet)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiWatchdogNumT WatchdogNum, SaHpiWatchdogT *Watchdog,
                                 void *UserData);
    SaErrorT (*WatchdogTimerReset)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiWatchdogNumT WatchdogNum, void *UserData);
    /* 12-13: inventory */
    SaErrorT (*EntityInventoryDataRead)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiEirIdT EirId, SaHpiUint32T BufferSize, void *UserData,
                                        SaHpiInventoryDataT *InventData, SaHpiUint32T *ActualSize);
    SaErrorT (*EntityInventoryDataWrite)(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiEirIdT EirId, SaHpiInventoryDataT *InventData,
                                         void *UserData);
    /* 14: builds the active-alarm events of a subscription */
    KviDsActiveAlarmTranslate ActiveAlarmTranslate;
    /* 15: called when the record is removed; frees what hangs on UserData */
    KviDsRdrResourcesRemove RdrResourcesRemove;
    /* 16-18: parameter control */
    KviDsDefaultRdrParmCtrl RdrDefaultParmControl;
    KviDsSaveRdrParmCtrl RdrSaveParmControl;
    KviDsRestoreRdrParmCtrl RdrRestoreParmControl;
};

/* ---- Services of the library that plug-ins call ----
 * kviCsRptEntryAdd (KviRpt.h) and kviCsRdrAdd (KviRdr.h) register resources
 * and records. The plug-in manager hands out the plug-in's own locks, one of
 * which is stored with each RPT entry; GetMaplLock requires the caller to
 * hold the master lock for reading, as ResourcesDiscover does. */
KVI_API SaErrorT kviDsMaplManagerGetMaplLock(SaHpiUint32T MaplNum, SaHpiUint32T LockNum,
                                             KviCsRwLockT **MaplLock) KVI_NOEXCEPT;
KVI_API SaErrorT kviDsMaplManagerUnprotectedGetMaplLock(SaHpiUint32T MaplNum, SaHpiUint32T LockNum,
                                                        KviCsRwLockT **MaplLock) KVI_NOEXCEPT;

/* Ready-made removal slots: they free UserDefined with the library's
 * allocator, for plug-ins whose user data is one block from KVI_CS_MALLOC. */
KVI_API SaErrorT kviDsDefaultRptResourcesRemove(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId,
                                                SaHpiRptEntryT *RptEntry, void *UserDefined,
                                                SaHpiBoolT Active,
                                                KviDsRptFnTable *FnTable) KVI_NOEXCEPT;
KVI_API SaErrorT kviDsDefaultRdrResourcesRemove(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId, SaHpiRdrT *RdrEntry,
                                                void *UserDefined,
                                                KviDsRdrFnTable *FnTable) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
