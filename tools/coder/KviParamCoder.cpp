// The parameter coder: a length before every parameter, a checksum over the
// body, and the header checks both ends run before taking a body apart.
#include "KviParamCoder.h"

#include <string.h>

#include "kvi/KviNonVolatile.h"

namespace
{

using Length = SaHpiUint16T;

KviMsgHdr *header(void *Msg) noexcept
{
    return static_cast<KviMsgHdr *>(Msg);
}

SaErrorT pack(KviMsgTypeT Type, SaHpiUint8T *Msg, SaHpiUint32T *Position, SaHpiUint32T *Remaining,
              const void *Data, SaHpiUint32T DataSize) noexcept
{
    if (DataSize > 0xffff || *Remaining < sizeof(Length) + DataSize) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Message 0x%04x: %u bytes do not fit in %u", Type, DataSize,
                 *Remaining);
        return SA_ERR_HPI_INVALID_DATA;
    }
    const Length length = static_cast<Length>(DataSize);
    memcpy(Msg + *Position, &length, sizeof length);
    memcpy(Msg + *Position + sizeof length, Data, DataSize);
    *Position += sizeof length + DataSize;
    *Remaining -= sizeof length + DataSize;
    return SA_OK;
}

SaErrorT unpack(KviMsgTypeT Type, const SaHpiUint8T *Msg, SaHpiUint32T *Position,
                SaHpiUint32T *Remaining, void *Data, SaHpiUint32T DataSize) noexcept
{
    Length length = 0;
    if (*Remaining >= sizeof length) {
        memcpy(&length, Msg + *Position, sizeof length);
    }
    if (*Remaining < sizeof length || length != DataSize || *Remaining - sizeof length < length) {
        KVI_DLOG(KVI_LOG_DBG_H, "Message 0x%04x: expected a %u-byte parameter, %u bytes left", Type,
                 DataSize, *Remaining);
        return SA_ERR_HPI_INVALID_DATA;
    }
    if (Data != nullptr) {
        memcpy(Data, Msg + *Position + sizeof length, length);
    }
    *Position += sizeof length + length;
    *Remaining -= sizeof length + length;
    return SA_OK;
}

} // namespace

SaErrorT kviCpsCodeMsgData(KviMsgTypeT Type, KviOperationT Operation, void *Msg,
                           SaHpiUint32T *Position, SaHpiUint32T *Remaining, void *Data,
                           SaHpiUint32T DataSize) noexcept
{
    KVI_CPS_NULL_CHECK(Msg);
    KVI_CPS_NULL_CHECK(Position);
    KVI_CPS_NULL_CHECK(Remaining);
    auto *bytes = static_cast<SaHpiUint8T *>(Msg);
    switch (Operation) {
    case KVI_OP_PACK:
        KVI_CPS_NULL_CHECK(Data);
        return pack(Type, bytes, Position, Remaining, Data, DataSize);
    case KVI_OP_UNPACK:
        return unpack(Type, bytes, Position, Remaining, Data, DataSize);
    default:
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Unknown coder operation %u", Operation);
        return SA_ERR_HPI_ERROR;
    }
}

void kviWireStart(void *Msg, KviMsgTypeT Type, SaHpiUint16T SequenceNumber) noexcept
{
    memset(Msg, 0, kviWireHeaderSize(Type));
    KviMsgHdr *h = header(Msg);
    h->MinHdr.Identifier = KVI_LIB_PROTOCOL_IDENTIFIER;
    h->MinHdr.MajorVersion = KVI_LIB_PROTOCOL_MAJOR_VERSION;
    h->MinHdr.MinorVersion = KVI_LIB_PROTOCOL_MINOR_VERSION;
    h->MinHdr.SequenceNumber = SequenceNumber;
    h->MsgType = Type;
}

void kviWireSeal(void *Msg, SaHpiUint32T End) noexcept
{
    KviMsgHdr *h = header(Msg);
    const SaHpiUint32T start = kviWireHeaderSize(h->MsgType);
    h->MinHdr.Size = static_cast<SaHpiUint16T>(End);
    h->Checksum =
        kviCsCrcGen(static_cast<SaHpiUint8T *>(Msg) + start, static_cast<SaHpiInt32T>(End - start));
}

KviCommRetCode kviWireCheck(const void *Msg) noexcept
{
    const KviMsgHdr *h = static_cast<const KviMsgHdr *>(Msg);
    if (h->MinHdr.Identifier != KVI_LIB_PROTOCOL_IDENTIFIER ||
        h->MinHdr.MajorVersion != KVI_LIB_PROTOCOL_MAJOR_VERSION ||
        h->MinHdr.MinorVersion != KVI_LIB_PROTOCOL_MINOR_VERSION) {
        return KVI_MSG_INVALID_PROTOCOL;
    }
    // The 10-byte minimum header says nothing about the rest: a message
    // shorter than its full header has no type or checksum to trust.
    if (h->MinHdr.Size < sizeof(KviMsgHdr)) {
        return KVI_MSG_INVALID_FORMAT;
    }
    const SaHpiUint32T start = kviWireHeaderSize(h->MsgType);
    if (h->MinHdr.Size < start ||
        kviCsCrcGen(static_cast<const SaHpiUint8T *>(Msg) + start,
                    static_cast<SaHpiInt32T>(h->MinHdr.Size - start)) != h->Checksum) {
        return KVI_MSG_INVALID_FORMAT;
    }
    return KVI_MSG_SUCCESS;
}

KviWireBody::KviWireBody(void *Msg, SaHpiUint32T Limit) noexcept
    : msg_(Msg), type_(header(Msg)->MsgType), position_(kviWireHeaderSize(type_)),
      remaining_(Limit - position_)
{
}

void KviWireBody::code(KviOperationT Operation, void *Data, SaHpiUint32T Size) noexcept
{
    if (ok_) {
        ok_ =
            kviCpsCodeMsgData(type_, Operation, msg_, &position_, &remaining_, Data, Size) == SA_OK;
    }
}
