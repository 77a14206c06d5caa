/* The wire between the daemon and its clients: IPv4 stream sockets, the
 * message headers, the table of message types, and the two routines that move
 * one whole message over a connection.
 *
 * A message is one header followed by the parameters of its call:
 *
 *   request:  KviReqMsgHdr (20 bytes), then the request's parameters
 *   response: KviRspMsgHdr (28 bytes), then the call's results
 *
 * Every field is in the host's byte order (both ends run little-endian x86;
 * nothing is converted), and the structures keep the natural alignment of
 * their members, padding included, identically on 32-bit and 64-bit x86: the
 * assertions at the end of this header hold the layout in place. Clear a
 * header with memset before filling it, so its padding goes out as zeros.
 *
 * The socket calls do at most one read or write each and report, rather than
 * finish, partial transfers; the message routines wait for readiness and
 * retry. Their result codes are the contract between the two layers:
 *
 *   SA_ERR_HPI_INVALID_REQUEST  the socket is closed or not open: give up
 *   SA_ERR_HPI_TIMEOUT          nothing moved in time (transient, retried)
 *   SA_ERR_HPI_DATA_TRUNCATED   part of the bytes moved (transient, retried)
 *   SA_ERR_HPI_ERROR            hard failure
 *   SA_ERR_HPI_BUSY             accept only: try again
 *
 * Every function returns SA_OK or an SA_ERR_HPI_* code. */
#ifndef KVI_PROTOCOL_H
#define KVI_PROTOCOL_H

#include <stddef.h>

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviLogging.h"
#include "kvi/KviSemaphore.h"

KVI_EXTERN_C_BEGIN

/* ---- Socket transport ---------------------------------------------------- */

/* Connects to PortNum (1024 and up) on Server, a dotted IPv4 address or else
 * a host name whose first address is used. The connect blocks. */
KVI_API SaErrorT kviCsOpenClientComm(SaHpiInt32T PortNum, const char *Server,
                                     SaHpiInt32T *Desc) KVI_NOEXCEPT;

/* Listens on PortNum on every local address, with a backlog of
 * MaxConnections. The port is not checked, and no address reuse is asked
 * for: a port left in TIME_WAIT by an earlier run refuses the bind. */
KVI_API SaErrorT kviCsOpenSvrComm(SaHpiInt32T PortNum, SaHpiInt32T MaxConnections,
                                  SaHpiInt32T *Desc) KVI_NOEXCEPT;

/* Accepts one connection on the listening Desc. SA_ERR_HPI_BUSY when accept
 * failed for a passing reason (nothing pending on a non-blocking socket, a
 * network or protocol hiccup): call again. */
KVI_API SaErrorT kviCsAcceptConnection(SaHpiInt32T Desc, SaHpiInt32T *ConnDesc) KVI_NOEXCEPT;

/* Makes Desc non-blocking. The status flags are replaced by O_NONBLOCK alone,
 * not added to: set other status flags afterwards. A connection should be
 * non-blocking before it meets kviCpsWriteProtoMsg, or a peer that stops
 * reading holds the writer inside write(2) whatever the time-out. */
KVI_API SaErrorT kviCsSetSockNbio(SaHpiInt32T Desc) KVI_NOEXCEPT;

/* One write of Size bytes. SA_ERR_HPI_DATA_TRUNCATED when fewer went out; the
 * bytes that did are not tracked. A peer that has gone gives
 * SA_ERR_HPI_ERROR, never SIGPIPE. */
KVI_API SaErrorT kviCsWriteMessage(SaHpiInt32T Desc, const void *Buf,
                                   SaHpiInt32T Size) KVI_NOEXCEPT;

/* One read of up to Size bytes; *Count tells how many came. A short read is
 * SA_OK (the caller checks *Count); end of stream is
 * SA_ERR_HPI_INVALID_REQUEST with *Count 0. */
KVI_API SaErrorT kviCsReadMessage(SaHpiInt32T Desc, void *Buf, SaHpiInt32T Size,
                                  SaHpiInt32T *Count) KVI_NOEXCEPT;

/* Closes Desc; a descriptor that was not open is SA_OK. */
KVI_API SaErrorT kviCsCloseComm(SaHpiInt32T Desc) KVI_NOEXCEPT;

/* ---- Message headers ----------------------------------------------------- */

#define KVI_LIB_PROTOCOL_IDENTIFIER 0x01
#define KVI_LIB_PROTOCOL_MAJOR_VERSION 0x0001
#define KVI_LIB_PROTOCOL_MINOR_VERSION 0x0001

/* What every message starts with; Size counts the whole message, this header
 * included, so no message exceeds 65535 bytes. */
typedef struct _KviMinMsgHdr {
    SaHpiUint8T Identifier;      /* KVI_LIB_PROTOCOL_IDENTIFIER; 1 byte of padding follows */
    SaHpiUint16T MajorVersion;   /* KVI_LIB_PROTOCOL_MAJOR_VERSION */
    SaHpiUint16T MinorVersion;   /* KVI_LIB_PROTOCOL_MINOR_VERSION */
    SaHpiUint16T SequenceNumber; /* chosen by the sender, echoed by the response */
    SaHpiUint16T Size;           /* bytes in the whole message */
} KviMinMsgHdr;

/* One of the KVI_*_REQ and KVI_*_RSP codes below. */
typedef SaHpiUint16T KviMsgTypeT;

typedef struct _KviMsgHdr {
    KviMinMsgHdr MinHdr;   /* 2 bytes of padding follow */
    SaHpiUint32T Checksum; /* computed and checked by the parameter coders, not here */
    KviMsgTypeT MsgType;   /* 2 bytes of padding follow */
} KviMsgHdr;

typedef struct _KviReqMsgHdr {
    KviMsgHdr MsgHdr; /* the request's parameters follow */
} KviReqMsgHdr;

typedef struct _KviRspMsgHdr {
    KviMsgHdr MsgHdr;
    SaHpiUint16T CommRetCode; /* a KviCommRetCode; 2 bytes of padding follow */
    SaErrorT SaRetCode;       /* the HPI result of the request; results follow */
} KviRspMsgHdr;

/* Whether the daemon could handle the request at all; SaRetCode then says
 * what the call itself returned. */
typedef enum {
    KVI_MSG_RESERVED = 0,
    KVI_MSG_SUCCESS = 1,
    KVI_MSG_FAILURE = 2,
    KVI_MSG_INVALID_FORMAT = 3,
    KVI_MSG_INVALID_PROTOCOL = 4,
    KVI_MSG_UNABLE_TO_PROCESS = 5
} KviCommRetCode;

/* ---- Message types ------------------------------------------------------- */

/* Every call has a request code (even) and a response code one above it.
 * 0x0000 to 0x0005 are unused. */
enum {
    KVI_SESSION_OPEN_REQ = 0x0006,
    KVI_SESSION_OPEN_RSP = 0x0007,
    KVI_SESSION_CLOSE_REQ = 0x0008,
    KVI_SESSION_CLOSE_RSP = 0x0009,
    KVI_RESOURCES_DISCOVER_REQ = 0x000a,
    KVI_RESOURCES_DISCOVER_RSP = 0x000b,
    KVI_RPT_INFO_GET_REQ = 0x000c,
    KVI_RPT_INFO_GET_RSP = 0x000d,
    KVI_RPT_ENTRY_GET_REQ = 0x000e,
    KVI_RPT_ENTRY_GET_RSP = 0x000f,
    KVI_RPT_ENTRY_GET_BY_RESOURCE_ID_REQ = 0x0010,
    KVI_RPT_ENTRY_GET_BY_RESOURCE_ID_RSP = 0x0011,
    KVI_RESOURCE_SEVERITY_SET_REQ = 0x0012,
    KVI_RESOURCE_SEVERITY_SET_RSP = 0x0013,
    KVI_RESOURCE_TAG_SET_REQ = 0x0014,
    KVI_RESOURCE_TAG_SET_RSP = 0x0015,
    KVI_RESOURCE_ID_GET_REQ = 0x0016,
    KVI_RESOURCE_ID_GET_RSP = 0x0017,
    KVI_ENTITY_SCHEMA_GET_REQ = 0x0018,
    KVI_ENTITY_SCHEMA_GET_RSP = 0x0019,
    KVI_EVENT_LOG_INFO_GET_REQ = 0x001a,
    KVI_EVENT_LOG_INFO_GET_RSP = 0x001b,
    KVI_EVENT_LOG_ENTRY_GET_REQ = 0x001c,
    KVI_EVENT_LOG_ENTRY_GET_RSP = 0x001d,
    KVI_EVENT_LOG_ENTRY_ADD_REQ = 0x001e,
    KVI_EVENT_LOG_ENTRY_ADD_RSP = 0x001f,
    KVI_EVENT_LOG_ENTRY_DELETE_REQ = 0x0020,
    KVI_EVENT_LOG_ENTRY_DELETE_RSP = 0x0021,
    KVI_EVENT_LOG_CLEAR_REQ = 0x0022,
    KVI_EVENT_LOG_CLEAR_RSP = 0x0023,
    KVI_EVENT_LOG_TIME_GET_REQ = 0x0024,
    KVI_EVENT_LOG_TIME_GET_RSP = 0x0025,
    KVI_EVENT_LOG_TIME_SET_REQ = 0x0026,
    KVI_EVENT_LOG_TIME_SET_RSP = 0x0027,
    KVI_EVENT_LOG_STATE_GET_REQ = 0x0028,
    KVI_EVENT_LOG_STATE_GET_RSP = 0x0029,
    KVI_EVENT_LOG_STATE_SET_REQ = 0x002a,
    KVI_EVENT_LOG_STATE_SET_RSP = 0x002b,
    KVI_SUBSCRIBE_REQ = 0x002c,
    KVI_SUBSCRIBE_RSP = 0x002d,
    KVI_UNSUBSCRIBE_REQ = 0x002e,
    KVI_UNSUBSCRIBE_RSP = 0x002f,
    KVI_EVENT_GET_REQ = 0x0030,
    KVI_EVENT_GET_RSP = 0x0031,
    KVI_RDR_GET_REQ = 0x0032,
    KVI_RDR_GET_RSP = 0x0033,
    KVI_SENSOR_READING_GET_REQ = 0x0034,
    KVI_SENSOR_READING_GET_RSP = 0x0035,
    KVI_SENSOR_READING_CONVERT_REQ = 0x0036,
    KVI_SENSOR_READING_CONVERT_RSP = 0x0037,
    KVI_SENSOR_THRESHOLDS_GET_REQ = 0x0038,
    KVI_SENSOR_THRESHOLDS_GET_RSP = 0x0039,
    KVI_SENSOR_THRESHOLDS_SET_REQ = 0x003a,
    KVI_SENSOR_THRESHOLDS_SET_RSP = 0x003b,
    KVI_SENSOR_TYPE_GET_REQ = 0x003c,
    KVI_SENSOR_TYPE_GET_RSP = 0x003d,
    KVI_SENSOR_EVENT_ENABLES_GET_REQ = 0x003e,
    KVI_SENSOR_EVENT_ENABLES_GET_RSP = 0x003f,
    KVI_SENSOR_EVENT_ENABLES_SET_REQ = 0x0040,
    KVI_SENSOR_EVENT_ENABLES_SET_RSP = 0x0041,
    KVI_CONTROL_TYPE_GET_REQ = 0x0042,
    KVI_CONTROL_TYPE_GET_RSP = 0x0043,
    KVI_CONTROL_STATE_GET_REQ = 0x0044,
    KVI_CONTROL_STATE_GET_RSP = 0x0045,
    KVI_CONTROL_STATE_SET_REQ = 0x0046,
    KVI_CONTROL_STATE_SET_RSP = 0x0047,
    KVI_ENTITY_INVENTORY_DATA_READ_REQ = 0x0048,
    KVI_ENTITY_INVENTORY_DATA_READ_RSP = 0x0049,
    KVI_ENTITY_INVENTORY_DATA_WRITE_REQ = 0x004a,
    KVI_ENTITY_INVENTORY_DATA_WRITE_RSP = 0x004b,
    KVI_WATCHDOG_TIMER_GET_REQ = 0x004c,
    KVI_WATCHDOG_TIMER_GET_RSP = 0x004d,
    KVI_WATCHDOG_TIMER_SET_REQ = 0x004e,
    KVI_WATCHDOG_TIMER_SET_RSP = 0x004f,
    KVI_WATCHDOG_TIMER_RESET_REQ = 0x0050,
    KVI_WATCHDOG_TIMER_RESET_RSP = 0x0051,
    /* 0x0052 to 0x006a: the hot-swap calls and the two power-state calls,
     * in the order of their prototypes in SaHpi.h */
    KVI_HOTSWAP_CONTROL_REQUEST_REQ = 0x0052,
    KVI_HOTSWAP_CONTROL_REQUEST_RSP = 0x0053,
    KVI_RESOURCE_ACTIVE_SET_REQ = 0x0054,
    KVI_RESOURCE_ACTIVE_SET_RSP = 0x0055,
    KVI_RESOURCE_INACTIVE_SET_REQ = 0x0056,
    KVI_RESOURCE_INACTIVE_SET_RSP = 0x0057,
    KVI_AUTO_INSERT_TIMEOUT_GET_REQ = 0x0058,
    KVI_AUTO_INSERT_TIMEOUT_GET_RSP = 0x0059,
    KVI_AUTO_INSERT_TIMEOUT_SET_REQ = 0x005a,
    KVI_AUTO_INSERT_TIMEOUT_SET_RSP = 0x005b,
    KVI_AUTO_EXTRACT_TIMEOUT_GET_REQ = 0x005c,
    KVI_AUTO_EXTRACT_TIMEOUT_GET_RSP = 0x005d,
    KVI_AUTO_EXTRACT_TIMEOUT_SET_REQ = 0x005e,
    KVI_AUTO_EXTRACT_TIMEOUT_SET_RSP = 0x005f,
    KVI_HOTSWAP_STATE_GET_REQ = 0x0060,
    KVI_HOTSWAP_STATE_GET_RSP = 0x0061,
    KVI_HOTSWAP_ACTION_REQUEST_REQ = 0x0062,
    KVI_HOTSWAP_ACTION_REQUEST_RSP = 0x0063,
    KVI_RESOURCE_POWER_STATE_GET_REQ = 0x0064,
    KVI_RESOURCE_POWER_STATE_GET_RSP = 0x0065,
    KVI_RESOURCE_POWER_STATE_SET_REQ = 0x0066,
    KVI_RESOURCE_POWER_STATE_SET_RSP = 0x0067,
    KVI_HOTSWAP_INDICATOR_STATE_GET_REQ = 0x0068,
    KVI_HOTSWAP_INDICATOR_STATE_GET_RSP = 0x0069,
    KVI_HOTSWAP_INDICATOR_STATE_SET_REQ = 0x006a,
    KVI_HOTSWAP_INDICATOR_STATE_SET_RSP = 0x006b,
    KVI_PARM_CONTROL_REQ = 0x006c,
    KVI_PARM_CONTROL_RSP = 0x006d,
    KVI_RESOURCE_RESET_STATE_GET_REQ = 0x006e,
    KVI_RESOURCE_RESET_STATE_GET_RSP = 0x006f,
    KVI_RESOURCE_RESET_STATE_SET_REQ = 0x0070,
    KVI_RESOURCE_RESET_STATE_SET_RSP = 0x0071
};

/* The highest code in use: a table indexed by message type has
 * KVI_CPS_LAST_MSG_TYPE + 1 slots. */
#define KVI_CPS_LAST_MSG_TYPE KVI_RESOURCE_RESET_STATE_SET_RSP

/* ---- Moving whole messages ----------------------------------------------- */

/* Reads one message into Buf, which holds Size bytes; on SA_OK Buf holds the
 * whole message, header first, and its KviMinMsgHdr Size tells how long it is.
 *
 * Waits up to TimeOut milliseconds for input (a negative TimeOut waits
 * without limit; 0 only looks), then takes Sem, the connection's read
 * semaphore (initial value 1), for at most 100 ms, so that one thread reads
 * the whole message, and reads the 10-byte KviMinMsgHdr and then the rest of
 * the Size it announces. Each part must come in one read: a message that
 * arrives in pieces is refused. The reads wait for their bytes only within
 * what is left of TimeOut.
 *
 * SA_ERR_HPI_TIMEOUT: no input in time, or Sem stayed taken.
 * SA_ERR_HPI_INVALID_REQUEST: the socket is closed or not open.
 * SA_ERR_HPI_INVALID_DATA: the header came short, or the Size it announces is
 *   below 10 (it cannot hold the header itself) or above the caller's Size
 *   (the message would not fit); nothing after the header is read.
 * SA_ERR_HPI_NO_RESPONSE: the header came but the rest did not, whole; or
 *   NumRetries is 0, which refuses every message once its header is read
 *   (any other NumRetries reads alike).
 * SA_ERR_HPI_ERROR: the wait or a read failed otherwise.
 * SA_ERR_HPI_INVALID_PARAMS: a null pointer, or Size below 10.
 * After SA_ERR_HPI_INVALID_DATA or SA_ERR_HPI_NO_RESPONSE the connection is
 * no longer at a message boundary: close it.
 *
 * To take any message, pass a Size of 65535. */
KVI_API SaErrorT kviCpsReadProtoMsg(SaHpiInt32T Desc, SaHpiInt32T TimeOut, SaHpiUint32T NumRetries,
                                    KviCsSemaphore *Sem, SaHpiInt32T Size, void *Buf) KVI_NOEXCEPT;

/* Writes the complete message in Buf, header first: the header's Size bytes.
 *
 * Waits up to TimeOut milliseconds for the socket to take data, up to
 * NumRetries more times, then writes, retrying a write that timed out or went
 * out short up to NumRetries times; a retry sends the whole message again.
 * The attempts are counted as they always have been, and the count decides
 * the result by equality with NumRetries:
 *
 * - a socket found writable on wait number NumRetries (counting from 0), or a
 *   write that succeeds on retry number NumRetries, is reported as
 *   SA_ERR_HPI_NO_RESPONSE, so NumRetries 0 never succeeds;
 * - waits that all time out go on to write, and writes that all fail
 *   transiently return SA_OK.
 *
 * SA_ERR_HPI_INVALID_REQUEST: the socket is closed or not open.
 * SA_ERR_HPI_INVALID_PARAMS: a null Buf, or a header Size below 10.
 * Writers of one connection take no lock here: serialize them. */
KVI_API SaErrorT kviCpsWriteProtoMsg(SaHpiInt32T Desc, SaHpiUint32T TimeOut,
                                     SaHpiUint32T NumRetries, const void *Buf) KVI_NOEXCEPT;

/* ---- For the parameter coders -------------------------------------------- */

/* Tells a coder which way a parameter goes; the coder defines the codes. */
typedef SaHpiUint8T KviOperationT;

/* Refuses a null pointer inside the protocol code: the message could not be
 * built or taken apart, which is SA_ERR_HPI_ERROR rather than a bad argument
 * of the caller's. */
#define KVI_CPS_NULL_CHECK(PointerVar)                                                             \
    do {                                                                                           \
        if ((PointerVar) == NULL) {                                                                \
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, #PointerVar " Protocol pointer is NULL.");              \
            return SA_ERR_HPI_ERROR;                                                               \
        }                                                                                          \
    } while (0)

/* Codes one parameter with the coder that the daemon and the client library
 * supply (kviCpsCodeMsgData, declared beside it; this library has none). On a
 * failure the calling function logs its exit and returns the coder's result. */
#define KVI_CODE_MSG(Type, Operation, Msg, Position, Remaining, Data, DataSize)                    \
    do {                                                                                           \
        SaErrorT kviCodeRc_ = kviCpsCodeMsgData((Type), (Operation), (Msg), (Position),            \
                                                (Remaining), (Data), (DataSize));                  \
        if (kviCodeRc_ != SA_OK) {                                                                 \
            KVI_FLOG(KVI_LOG_FUNC_OUT, "kviCpsCodeMsgData returned %d", kviCodeRc_);               \
            return kviCodeRc_;                                                                     \
        }                                                                                          \
    } while (0)

/* ---- Layout, checked wherever this header is compiled -------------------- */

#ifdef __cplusplus
#define KVI_LAYOUT_CHECK(Cond) static_assert(Cond, #Cond)
#else
#define KVI_LAYOUT_CHECK(Cond) _Static_assert(Cond, #Cond)
#endif
KVI_LAYOUT_CHECK(sizeof(KviMinMsgHdr) == 10);
KVI_LAYOUT_CHECK(offsetof(KviMinMsgHdr, Identifier) == 0);
KVI_LAYOUT_CHECK(offsetof(KviMinMsgHdr, MajorVersion) == 2);
KVI_LAYOUT_CHECK(offsetof(KviMinMsgHdr, MinorVersion) == 4);
KVI_LAYOUT_CHECK(offsetof(KviMinMsgHdr, SequenceNumber) == 6);
KVI_LAYOUT_CHECK(offsetof(KviMinMsgHdr, Size) == 8);
KVI_LAYOUT_CHECK(sizeof(KviMsgHdr) == 20);
KVI_LAYOUT_CHECK(offsetof(KviMsgHdr, MinHdr) == 0);
KVI_LAYOUT_CHECK(offsetof(KviMsgHdr, Checksum) == 12);
KVI_LAYOUT_CHECK(offsetof(KviMsgHdr, MsgType) == 16);
KVI_LAYOUT_CHECK(sizeof(KviReqMsgHdr) == 20);
KVI_LAYOUT_CHECK(offsetof(KviReqMsgHdr, MsgHdr) == 0);
KVI_LAYOUT_CHECK(sizeof(KviRspMsgHdr) == 28);
KVI_LAYOUT_CHECK(offsetof(KviRspMsgHdr, MsgHdr) == 0);
KVI_LAYOUT_CHECK(offsetof(KviRspMsgHdr, CommRetCode) == 20);
KVI_LAYOUT_CHECK(offsetof(KviRspMsgHdr, SaRetCode) == 24);
KVI_LAYOUT_CHECK(sizeof(KviMsgTypeT) == 2 && sizeof(SaErrorT) == 4);
#undef KVI_LAYOUT_CHECK

KVI_EXTERN_C_END

#endif
