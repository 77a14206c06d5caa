// Saving and reading the settings that parameter control keeps in the
// non-volatile store, one object per setting, and the shapes the parameter
// control units share: reading a saved item for a restore and walking the
// records of a resource.
//
// Values are stored as they lie in memory. Two lengths are shorter than the
// structures: a resource tag keeps only its used part, and a text control
// keeps DataLength + 10 bytes of its state. Readers accept the short read and
// check it against the stored length field.
#include "core/SaHpi/parmControl/ParmControlHelpers.h"

#include <cstddef>
#include <cstring>

namespace
{

// The header of a text buffer up to its data: type, language, length.
constexpr SaHpiUint32T TEXT_BUFFER_HEADER = offsetof(SaHpiTextBufferT, Data);
// A text control keeps DataLength + 10 bytes of its state; the length field
// itself lies at this offset, so shorter states do not carry it.
constexpr SaHpiUint32T TEXT_CTRL_EXTRA = 10;
constexpr SaHpiUint32T TEXT_CTRL_LENGTH_END =
    offsetof(SaHpiCtrlStateT, StateUnion.Text.Text.DataLength) + 1;
// An inventory object is a length word, the data and three more bytes.
constexpr SaHpiUint32T FRU_LENGTH_WORD = sizeof(SaHpiUint32T);
constexpr SaHpiUint32T FRU_EXTRA = FRU_LENGTH_WORD + 3;
constexpr SaHpiUint32T FRU_SIZE_MASK = 0xFFFF;

// A setting's key: of the domain, of the resource, or with Num of one of its
// records.
struct NvKey {
    char Text[KVI_MAX_NV_KEY_LENGTH];

    NvKey(const char *Prefix, SaHpiBoolT Flag, SaHpiDomainIdT DomainId) noexcept
    {
        snprintf(Text, KVI_MAX_NV_KEY_LENGTH, "%s%d%8.8x", Prefix, Flag ? 1 : 0,
                 static_cast<unsigned>(DomainId));
        KVI_DLOG(KVI_LOG_DBG_L, "%s key: %s", Prefix, Text);
    }

    NvKey(const char *Prefix, SaHpiBoolT Flag, SaHpiDomainIdT DomainId,
          SaHpiResourceIdT ResourceId) noexcept
    {
        KVI_CREATE_NV_PARMCTRL_KEY_RPT(Text, Prefix, Flag, DomainId, ResourceId);
    }
    NvKey(const char *Prefix, SaHpiBoolT Flag, SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
          SaHpiUint8T Num) noexcept
    {
        KVI_CREATE_NV_PARMCTRL_KEY_RDR(Text, Prefix, Flag, DomainId, ResourceId, Num);
    }
};

SaErrorT putItem(const NvKey &Key, const char *Storing, SaHpiUint32T Length,
                 const void *Value) noexcept
{
    KVI_DLOG(KVI_LOG_DBG_L, "%s", Storing);
    SaErrorT rc = kviCsNonVolatilePut(Key.Text, Length, Value);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsNonVolatilePut failed. rc=%d\n", rc);
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

// Reads the first Length bytes saved under Key. A key never saved is
// SA_ERR_HPI_NOT_PRESENT, silent for the daemon's own copy, which is often
// missing; a short read passes through only when the caller checks it.
SaErrorT getItem(const char *Key, SaHpiBoolT IsDaemonSave, SaHpiUint32T Length, void *Value,
                 SaHpiUint32T *BytesRead, bool AcceptShort) noexcept
{
    SaErrorT rc = kviCsNonVolatileGet(Key, 0, Length, Value, BytesRead);
    if (rc == SA_OK || (AcceptShort && rc == SA_ERR_HPI_DATA_TRUNCATED))
        return rc;
    if (rc == SA_ERR_HPI_NOT_PRESENT) {
        if (!IsDaemonSave)
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsNonVolatileGet failed. rc=%d\n", rc);
        return SA_ERR_HPI_NOT_PRESENT;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsNonVolatileGet failed. rc=%d\n", rc);
    return SA_ERR_HPI_ERROR;
}

SaErrorT getWhole(const NvKey &Key, SaHpiBoolT IsDaemonSave, SaHpiUint32T Length,
                  void *Value) noexcept
{
    SaHpiUint32T bytesRead = 0;
    return getItem(Key.Text, IsDaemonSave, Length, Value, &bytesRead, false);
}

SaHpiUint32T ctrlStateLength(const SaHpiCtrlStateT *CtrlState) noexcept
{
    if (kviCsRawEnum(CtrlState->Type) == SAHPI_CTRL_TYPE_TEXT)
        return CtrlState->StateUnion.Text.Text.DataLength + TEXT_CTRL_EXTRA;
    return sizeof(SaHpiCtrlStateT);
}

// A short control state must be a text state of the stored length; where the
// length field was not stored it reads as 0.
bool shortCtrlStateIsSound(const SaHpiCtrlStateT *CtrlState, SaHpiUint32T BytesRead) noexcept
{
    if (BytesRead < TEXT_CTRL_EXTRA || kviCsRawEnum(CtrlState->Type) != SAHPI_CTRL_TYPE_TEXT)
        return false;
    return BytesRead < TEXT_CTRL_LENGTH_END || BytesRead == ctrlStateLength(CtrlState);
}

// Copies the data of an inventory object read from its start (BytesRead
// bytes of it) into a caller's buffer of Room bytes.
SaErrorT copyFru(const SaHpiUint8T *Object, SaHpiUint32T BytesRead, SaHpiUint32T Room,
                 void *FruBuffer) noexcept
{
    SaHpiUint32T stored = 0;
    if (BytesRead >= FRU_LENGTH_WORD)
        memcpy(&stored, Object, FRU_LENGTH_WORD);
    SaHpiUint32T copied = stored < Room ? stored : Room;
    if (BytesRead < FRU_LENGTH_WORD || BytesRead - FRU_LENGTH_WORD < copied) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "bytesRead did not match FRU size. %d, %d", BytesRead,
                 stored + FRU_EXTRA);
        return SA_ERR_HPI_ERROR;
    }
    memcpy(FruBuffer, Object + FRU_LENGTH_WORD, copied);
    return stored > copied ? SA_ERR_HPI_DATA_TRUNCATED : SA_OK;
}

} // namespace

// ---------------------------------------------------------------------------
// The domain's auto-insert timeout

SaErrorT kviCsSaveAutoInsertTimeoutNV(SaHpiDomainIdT DomainId, SaHpiBoolT IsDaemonSave,
                                      SaHpiTimeoutT Timeout) noexcept
{
    KVI_TRACE("");
    return putItem(NvKey(KVI_NVKEY_AUTO_INSERT_TIMEOUT_PREFIX, IsDaemonSave, DomainId),
                   "Storing auto-insert timeout in Non-Vol. memory", sizeof Timeout, &Timeout);
}

SaErrorT kviCsGetAutoInsertTimeoutNV(SaHpiDomainIdT DomainId, SaHpiBoolT IsDaemonSave,
                                     SaHpiTimeoutT *Timeout) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Timeout);
    return getWhole(NvKey(KVI_NVKEY_AUTO_INSERT_TIMEOUT_PREFIX, IsDaemonSave, DomainId),
                    IsDaemonSave, sizeof *Timeout, Timeout);
}

// ---------------------------------------------------------------------------
// Event-log state, resource tag, severity

KVI_EXPORT SaErrorT kviCsSaveEvtLogStNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiBoolT IsDaemonSave, SaHpiBoolT Enable) noexcept
{
    KVI_TRACE("");
    return putItem(NvKey(KVI_NVKEY_EVENT_LOG_ST_PREFIX, IsDaemonSave, DomainId, ResourceId),
                   "Storing event log state in Non-Vol. memory", sizeof Enable, &Enable);
}

KVI_EXPORT SaErrorT kviCsGetEvtLogStNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                       SaHpiBoolT IsDaemonSave, SaHpiBoolT *Enable) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Enable);
    return getWhole(NvKey(KVI_NVKEY_EVENT_LOG_ST_PREFIX, IsDaemonSave, DomainId, ResourceId),
                    IsDaemonSave, sizeof *Enable, Enable);
}

KVI_EXPORT SaErrorT kviCsSaveResTagNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiBoolT IsDaemonSave,
                                      const SaHpiTextBufferT *ResourceTag) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ResourceTag);
    return putItem(NvKey(KVI_NVKEY_RESOURCE_TAG_PREFIX, IsDaemonSave, DomainId, ResourceId),
                   "Storing resource tag in Non-Vol. memory",
                   TEXT_BUFFER_HEADER + ResourceTag->DataLength, ResourceTag);
}

SaErrorT kviCsReadResTagNV(const char *Key, bool LogMissing, SaHpiUint32T MismatchLevel,
                           SaHpiTextBufferT *ResourceTag) noexcept
{
    KVI_TRACE("");
    memset(ResourceTag, 0, sizeof *ResourceTag);
    SaHpiUint32T bytesRead = 0;
    SaErrorT rc = getItem(Key, LogMissing ? SAHPI_FALSE : SAHPI_TRUE, sizeof *ResourceTag,
                          ResourceTag, &bytesRead, true);
    if (rc != SA_OK && rc != SA_ERR_HPI_DATA_TRUNCATED)
        return rc;
    SaHpiUint32T stored = TEXT_BUFFER_HEADER + ResourceTag->DataLength;
    if (bytesRead != stored) {
        kviCsLogger(KVI_LOG_POSITION_(MismatchLevel),
                    "bytesRead did not match TextBuffer size. %d, %d", bytesRead, stored);
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsGetResTagNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiBoolT IsDaemonSave,
                                     SaHpiTextBufferT *ResourceTag) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ResourceTag);
    NvKey key(KVI_NVKEY_RESOURCE_TAG_PREFIX, IsDaemonSave, DomainId, ResourceId);
    return kviCsReadResTagNV(key.Text, !IsDaemonSave, KVI_LOG_ERR_NONFATAL_NUM, ResourceTag);
}

KVI_EXPORT SaErrorT kviCsSaveResSeverityNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                           SaHpiBoolT IsDaemonSave,
                                           const SaHpiSeverityT *Severity) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Severity);
    return putItem(NvKey(KVI_NVKEY_RESOURCE_SEVERITY_PREFIX, IsDaemonSave, DomainId, ResourceId),
                   "Storing resource severity in Non-Vol. memory", sizeof *Severity, Severity);
}

KVI_EXPORT SaErrorT kviCsGetResSeverityNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                          SaHpiBoolT IsDaemonSave,
                                          SaHpiSeverityT *Severity) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Severity);
    return getWhole(NvKey(KVI_NVKEY_RESOURCE_SEVERITY_PREFIX, IsDaemonSave, DomainId, ResourceId),
                    IsDaemonSave, sizeof *Severity, Severity);
}

// ---------------------------------------------------------------------------
// Sensor thresholds and event enables

KVI_EXPORT SaErrorT kviCsSaveThreshNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                      const SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(SensorThresholds);
    return putItem(
        NvKey(KVI_NVKEY_SENSOR_THRESH_PREFIX, IsDaemonSave, DomainId, ResourceId, SensorNum),
        "Storing Sensor Thresholds in Non-Vol. memory", sizeof *SensorThresholds, SensorThresholds);
}

KVI_EXPORT SaErrorT kviCsGetThreshNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                     SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                     SaHpiSensorThresholdsT *SensorThresholds) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(SensorThresholds);
    return getWhole(
        NvKey(KVI_NVKEY_SENSOR_THRESH_PREFIX, IsDaemonSave, DomainId, ResourceId, SensorNum),
        IsDaemonSave, sizeof *SensorThresholds, SensorThresholds);
}

KVI_EXPORT SaErrorT kviCsSaveEvtEnablesNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                          SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                          const SaHpiSensorEvtEnablesT *Enables) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Enables);
    return putItem(
        NvKey(KVI_NVKEY_EVENT_ENABLE_PREFIX, IsDaemonSave, DomainId, ResourceId, SensorNum),
        "Storing event enables in Non-Vol. memory", sizeof *Enables, Enables);
}

KVI_EXPORT SaErrorT kviCsGetEvtEnablesNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiSensorNumT SensorNum, SaHpiBoolT IsDaemonSave,
                                         SaHpiSensorEvtEnablesT *Enables) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Enables);
    return getWhole(
        NvKey(KVI_NVKEY_EVENT_ENABLE_PREFIX, IsDaemonSave, DomainId, ResourceId, SensorNum),
        IsDaemonSave, sizeof *Enables, Enables);
}

// ---------------------------------------------------------------------------
// Control states

KVI_EXPORT SaErrorT kviCsSaveCtrlStateNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                         SaHpiCtrlNumT CtrlNum, SaHpiBoolT IsDaemonSave,
                                         const SaHpiCtrlStateT *CtrlState) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(CtrlState);
    return putItem(
        NvKey(KVI_NVKEY_CONTROL_STATE_PREFIX, IsDaemonSave, DomainId, ResourceId, CtrlNum),
        "Storing control state in Non-Vol. memory", ctrlStateLength(CtrlState), CtrlState);
}

KVI_EXPORT SaErrorT kviCsGetCtrlStateNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                        SaHpiCtrlNumT CtrlNum, SaHpiBoolT IsDaemonSave,
                                        SaHpiCtrlStateT *CtrlState) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(CtrlState);
    NvKey key(KVI_NVKEY_CONTROL_STATE_PREFIX, IsDaemonSave, DomainId, ResourceId, CtrlNum);
    memset(CtrlState, 0, sizeof *CtrlState);
    SaHpiUint32T bytesRead = 0;
    SaErrorT rc = getItem(key.Text, IsDaemonSave, sizeof *CtrlState, CtrlState, &bytesRead, true);
    if (rc != SA_ERR_HPI_DATA_TRUNCATED)
        return rc;
    if (!shortCtrlStateIsSound(CtrlState, bytesRead)) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "bytesRead did not match control state size. %d, %d",
                 bytesRead, ctrlStateLength(CtrlState));
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    return SA_OK;
}

// ---------------------------------------------------------------------------
// Inventory data

KVI_EXPORT SaErrorT kviCsSaveFruNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                   SaHpiEirIdT EirId, SaHpiBoolT IsDaemonSave, SaHpiUint32T FruSize,
                                   const void *FruBuffer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(FruBuffer);
    NvKey key(KVI_NVKEY_SAVE_FRU_PREFIX, IsDaemonSave, DomainId, ResourceId, EirId);
    SaHpiUint32T size = FruSize & FRU_SIZE_MASK;
    auto *object = static_cast<SaHpiUint8T *>(KVI_CS_MALLOC(size + FRU_EXTRA));
    if (object == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Malloc failed");
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    memset(object, 0, size + FRU_EXTRA);
    memcpy(object, &size, FRU_LENGTH_WORD);
    memcpy(object + FRU_LENGTH_WORD, FruBuffer, size);
    SaErrorT rc = putItem(key, "Storing FRU in Non-Vol. memory", size + FRU_EXTRA, object);
    KVI_CS_FREE(object);
    return rc;
}

KVI_EXPORT SaErrorT kviCsGetFruSizeNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                      SaHpiEirIdT EirId, SaHpiBoolT IsDaemonSave,
                                      SaHpiUint32T *FruSize) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(FruSize);
    return getWhole(NvKey(KVI_NVKEY_SAVE_FRU_PREFIX, IsDaemonSave, DomainId, ResourceId, EirId),
                    IsDaemonSave, FRU_LENGTH_WORD, FruSize);
}

KVI_EXPORT SaErrorT kviCsGetFruNV(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                  SaHpiEirIdT EirId, SaHpiBoolT IsDaemonSave, SaHpiUint32T FruSize,
                                  void *FruBuffer) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(FruBuffer);
    NvKey key(KVI_NVKEY_SAVE_FRU_PREFIX, IsDaemonSave, DomainId, ResourceId, EirId);
    // The object is read whole from its start, length word first, so that
    // the word and the data come from the same file.
    SaHpiUint32T room = FruSize < FRU_SIZE_MASK ? FruSize : FRU_SIZE_MASK;
    auto *object = static_cast<SaHpiUint8T *>(KVI_CS_MALLOC(room + FRU_LENGTH_WORD));
    if (object == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Malloc failed");
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    SaHpiUint32T bytesRead = 0;
    SaErrorT rc = getItem(key.Text, IsDaemonSave, room + FRU_LENGTH_WORD, object, &bytesRead, true);
    if (rc == SA_OK || rc == SA_ERR_HPI_DATA_TRUNCATED)
        rc = copyFru(object, bytesRead, room, FruBuffer);
    KVI_CS_FREE(object);
    return rc;
}

// ---------------------------------------------------------------------------
// Shapes shared by the restores and the record walks

SaErrorT kviCsRestoreReadResult(SaErrorT ReadRc, SaHpiBoolT IsDaemonRestore,
                                const KviRestoreTextsT &Texts, bool *Found) noexcept
{
    *Found = ReadRc == SA_OK;
    if (ReadRc == SA_OK)
        return SA_OK;
    if (ReadRc == SA_ERR_HPI_NOT_PRESENT) {
        if (IsDaemonRestore)
            return SA_OK;
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "%s", Texts.Missing);
        return Texts.MissingRc;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, Texts.Failed, ReadRc);
    return Texts.FailedKeepsCode ? ReadRc : SA_ERR_HPI_ERROR;
}

SaErrorT kviCsRdrWalk(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                      const char *InactiveText, KviRdrVisitFnT Visit, void *Context) noexcept
{
    KVI_TRACE("");
    SaHpiEntryIdT entry = SAHPI_FIRST_ENTRY;
    do {
        KviRdrVisitT record{};
        SaHpiEntryIdT next = SAHPI_LAST_ENTRY;
        SaErrorT rc =
            kviCsRdrGet(DomainId, ResourceId, SAHPI_NO_RECORD, entry, &next, &record.Rdr,
                        &record.Active, &record.UserData, &record.FnTable, nullptr, nullptr);
        if (rc == SA_ERR_HPI_NOT_PRESENT && entry == SAHPI_FIRST_ENTRY) {
            KVI_DLOG(KVI_LOG_DBG_L, "No RDRs exist. Returning OK");
            return SA_OK;
        }
        if (rc != SA_OK) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to retrieve RDR. rc %d", rc);
            return rc;
        }
        KVI_DLOG(KVI_LOG_DBG_L, "Next Entry %d", next);
        if (!record.Active)
            KVI_DLOG(KVI_LOG_DBG_L, "%s", InactiveText);
        else if ((rc = Visit(DomainId, ResourceId, &record, Context)) != SA_OK)
            return rc;
        entry = next;
    } while (entry != SAHPI_LAST_ENTRY);
    return SA_OK;
}

SaErrorT kviCsSensorCapabilities(SaHpiDomainIdT DomainId, SaHpiResourceIdT ResourceId,
                                 SaHpiCapabilitiesT *Capabilities) noexcept
{
    SaHpiRptEntryT entry;
    SaErrorT rc = kviCsRptActiveEntryGetByRid(DomainId, ResourceId, &entry, nullptr, nullptr,
                                              nullptr, nullptr);
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "kviCsRptActiveEntryGetByRid failed. rc=%d", rc);
        return SA_ERR_HPI_ERROR;
    }
    *Capabilities = entry.ResourceCapabilities;
    return SA_OK;
}
