/* The parameter coder shared by the daemon and the client library: how the
 * parameters and results of an HPI call travel after the message headers.
 *
 * A body is a row of parameters, each a 16-bit length followed by that many
 * bytes of the parameter as it lies in memory (host byte order, the
 * structures of SaHpi.h with their padding). The length lets a receiver
 * refuse a parameter that is not the size it expects, so a body that is
 * short, long or put together differently never gets read past its end.
 *
 * Structures are sent as they lie in memory, so both ends must lay them out
 * alike. Every request therefore starts with the sender's layout tag
 * (KVI_WIRE_LAYOUT_TAG: pointer size and the alignment of 64-bit numbers),
 * and the daemon refuses a request whose tag differs from its own with
 * KVI_MSG_INVALID_PROTOCOL instead of misreading it.
 *
 * The checksum of a message is kviCsCrcGen over its body; the sequence
 * number of a response is that of its request. */
#ifndef KVI_PARAM_CODER_H
#define KVI_PARAM_CODER_H

#include "SaHpi.h"
#include "kvi/KviProtocol.h"

/* What kviCpsCodeMsgData does with one parameter. */
enum : KviOperationT {
    KVI_OP_PACK = 1,  /* append Data (DataSize bytes) at Position */
    KVI_OP_UNPACK = 2 /* take the next parameter, which must be DataSize bytes, into Data */
};

#define KVI_WIRE_MAX_MSG 65535u
#define KVI_WIRE_LAYOUT_TAG ((SaHpiUint8T)(sizeof(void *) | (alignof(SaHpiInt64T) << 4)))

/* Codes one parameter of a message of Type. Msg is the whole message,
 * Position the offset of the parameter, Remaining what is left of the
 * buffer (packing) or of the body (unpacking); both move past the parameter.
 * Unpacking with a null Data skips the parameter after checking its size.
 * SA_ERR_HPI_INVALID_DATA when it does not fit or is not DataSize bytes. */
SaErrorT kviCpsCodeMsgData(KviMsgTypeT Type, KviOperationT Operation, void *Msg,
                           SaHpiUint32T *Position, SaHpiUint32T *Remaining, void *Data,
                           SaHpiUint32T DataSize) noexcept;

/* The size of the header that a message of Type starts with. */
inline SaHpiUint32T kviWireHeaderSize(KviMsgTypeT Type) noexcept
{
    return (Type & 1) ? sizeof(KviRspMsgHdr) : sizeof(KviReqMsgHdr);
}

/* Clears and fills the header of a message of Type in Msg; the body starts
 * at kviWireHeaderSize(Type). */
void kviWireStart(void *Msg, KviMsgTypeT Type, SaHpiUint16T SequenceNumber) noexcept;

/* Ends a message whose body runs up to End: its size and checksum. */
void kviWireSeal(void *Msg, SaHpiUint32T End) noexcept;

/* Checks a message that kviCpsReadProtoMsg delivered whole: its identifier
 * and versions (KVI_MSG_INVALID_PROTOCOL), then that its size holds its
 * header and that the checksum matches its body (KVI_MSG_INVALID_FORMAT).
 * KVI_MSG_SUCCESS when it can be taken apart. */
KviCommRetCode kviWireCheck(const void *Msg) noexcept;

/* One body being written or read, over kviCpsCodeMsgData. A failed step
 * sticks: later steps do nothing and ok() stays false. */
class KviWireBody
{
  public:
    KviWireBody(void *Msg, SaHpiUint32T Limit) noexcept;

    void put(const void *Data, SaHpiUint32T Size) noexcept
    {
        code(KVI_OP_PACK, const_cast<void *>(Data), Size);
    }
    void get(void *Data, SaHpiUint32T Size) noexcept { code(KVI_OP_UNPACK, Data, Size); }
    template <typename T> void put(const T &Value) noexcept { put(&Value, sizeof(T)); }
    template <typename T> void get(T &Value) noexcept { get(&Value, sizeof(T)); }

    bool ok() const noexcept { return ok_; }
    /* Everything read, nothing left over. */
    bool finished() const noexcept { return ok_ && remaining_ == 0; }
    SaHpiUint32T end() const noexcept { return position_; }
    void *msg() const noexcept { return msg_; }

  private:
    void code(KviOperationT Operation, void *Data, SaHpiUint32T Size) noexcept;

    void *msg_;
    KviMsgTypeT type_;
    SaHpiUint32T position_;
    SaHpiUint32T remaining_;
    bool ok_ = true;
};

#endif
