// The library's ready-made parameter-control slots for control records:
// back to the default state the record declares, save the current state,
// put a saved state back. Plug-ins put them into the RdrDefaultParmControl,
// RdrSaveParmControl and RdrRestoreParmControl slots of their controls.
#include <cstring>

#include "core/SaHpi/parmControl/ParmControlHelpers.h"

namespace
{

constexpr KviRestoreTextsT CTRL_STATE_TEXTS = {
    "Parm control restore was called without a save done first", SA_ERR_HPI_INVALID_REQUEST,
    "Failed to get control state from NV", false};

// The record's own default for its type; false for a type HPI does not know.
// The state and the record name each type's member alike.
bool defaultState(const SaHpiCtrlRecT &Ctrl, SaHpiCtrlStateT *State) noexcept
{
    memcpy(&State->Type, &Ctrl.Type, sizeof State->Type);
#define KVI_CTRL_DEFAULT(Type, Member)                                                             \
    case Type:                                                                                     \
        State->StateUnion.Member = Ctrl.TypeUnion.Member.Default;                                  \
        return true
    switch (kviCsRawEnum(Ctrl.Type)) {
        KVI_CTRL_DEFAULT(SAHPI_CTRL_TYPE_DIGITAL, Digital);
        KVI_CTRL_DEFAULT(SAHPI_CTRL_TYPE_DISCRETE, Discrete);
        KVI_CTRL_DEFAULT(SAHPI_CTRL_TYPE_ANALOG, Analog);
        KVI_CTRL_DEFAULT(SAHPI_CTRL_TYPE_STREAM, Stream);
        KVI_CTRL_DEFAULT(SAHPI_CTRL_TYPE_TEXT, Text);
        KVI_CTRL_DEFAULT(SAHPI_CTRL_TYPE_OEM, Oem);
    default:
        return false;
    }
#undef KVI_CTRL_DEFAULT
}

} // namespace

SaErrorT kviCsApplyCtrlState(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                             KviDsRdrFnTable *FnTable, void *UserData, SaHpiCtrlStateT *State,
                             SaErrorT NullSlotRc) noexcept
{
    if (FnTable->ControlStateSet == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "ControlStateSet is NULL.");
        return NullSlotRc;
    }
    SaHpiCtrlNumT num = Rdr->RdrTypeUnion.CtrlRec.Num;
    SaErrorT rc = FnTable->ControlStateSet(DomainId, ResourceId, num, State, UserData);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to set default control state. Ctrl Num %d", num);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRestoreControlDefaults(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                                                KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(UserData);
    SaHpiCtrlStateT state;
    memset(&state, 0, sizeof state);
    if (!defaultState(Rdr->RdrTypeUnion.CtrlRec, &state)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid Control Type");
        return SA_ERR_HPI_ERROR;
    }
    return kviCsApplyCtrlState(DomainId, ResourceId, Rdr, FnTable, UserData, &state,
                               SA_ERR_HPI_INVALID_CMD);
}

KVI_EXPORT SaErrorT kviCsRdrSaveCtrlParmControl(SaHpiDomainIdT DomainId,
                                                SaHpiResourceIdT ResourceId, SaHpiRdrT *Rdr,
                                                KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u", DomainId, ResourceId);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(UserData);
    const SaHpiCtrlRecT &ctrl = Rdr->RdrTypeUnion.CtrlRec;
    SaHpiCtrlStateT state;
    memset(&state, 0, sizeof state);
    memcpy(&state.Type, &ctrl.Type, sizeof state.Type);
    // A text control is saved with all of its lines.
    if (kviCsRawEnum(ctrl.Type) == SAHPI_CTRL_TYPE_TEXT)
        state.StateUnion.Text.Line = SAHPI_TLN_ALL_LINES;
    if (FnTable->ControlStateGet == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "ControlStateGet is NULL.");
        return SA_ERR_HPI_INVALID_CMD;
    }
    SaErrorT rc = FnTable->ControlStateGet(DomainId, ResourceId, ctrl.Num, UserData, &state);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "ControlStateGet failed. rc %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    rc = kviCsSaveCtrlStateNV(DomainId, ResourceId, ctrl.Num, SAHPI_FALSE, &state);
    if (rc != SA_OK) {
        KVI_DLOG(KVI_LOG_DBG_H, "kviCsSaveCtrlStateNV failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsRdrRestoreCtrl(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiBoolT IsDaemonRestore, SaHpiRdrT *Rdr,
                                        KviDsRdrFnTable *FnTable, void *UserData) noexcept
{
    KVI_TRACE("domain=%u, rid=%u, daemon=%d", DomainId, ResourceId, IsDaemonRestore);
    KVI_NULL_CHECK(Rdr);
    KVI_NULL_CHECK(FnTable);
    KVI_NULL_CHECK(UserData);
    SaHpiCtrlNumT num = Rdr->RdrTypeUnion.CtrlRec.Num;
    SaHpiCtrlStateT state;
    bool found = false;
    SaErrorT rc = kviCsRestoreReadResult(
        kviCsGetCtrlStateNV(DomainId, ResourceId, num, IsDaemonRestore, &state), IsDaemonRestore,
        CTRL_STATE_TEXTS, &found);
    if (rc != SA_OK || !found)
        return rc;
    // An empty set slot is SA_ERR_HPI_ERROR here but SA_ERR_HPI_INVALID_CMD
    // for the defaults; callers have long told the two apart.
    return kviCsApplyCtrlState(DomainId, ResourceId, Rdr, FnTable, UserData, &state,
                               SA_ERR_HPI_ERROR);
}
