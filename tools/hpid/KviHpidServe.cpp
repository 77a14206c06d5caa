// One client connection: read a request, check it, call the library, send
// the response. Requests are served one at a time per connection; a client
// that wants calls in parallel opens more connections.
#include <poll.h>
#include <stdlib.h>
#include <string.h>

#include <vector>

#include "KviHpid.h"
#include "coder/KviInventoryWire.h"
#include "coder/KviWireCalls.h"

std::atomic<bool> kviHpidStopping{false};

namespace
{

constexpr SaHpiInt32T READ_SLICE_MS = 1000;
constexpr SaHpiUint32T WRITE_TIMEOUT_MS = 5000;
constexpr SaHpiUint32T RETRIES = 3;
// A blocking event wait is served in slices, so a peer that hangs up or a
// daemon that stops is noticed within one of them.
constexpr SaHpiTimeoutT EVENT_SLICE_NS = 500000000LL;

thread_local SaHpiInt32T currentDesc = -1;

bool peerGone() noexcept
{
    if (currentDesc < 0) {
        return false;
    }
    pollfd p = {currentDesc, POLLRDHUP, 0};
    return poll(&p, 1, 0) > 0 && (p.revents & (POLLRDHUP | POLLHUP | POLLERR)) != 0;
}

// A session belongs to the connection that opened it and closes with it.
SaErrorT sessionOpen(SaHpiDomainIdT DomainId, SaHpiSessionIdT *SessionId,
                     void *SecurityParams) noexcept
{
    SaErrorT rc = saHpiSessionOpen(DomainId, SessionId, SecurityParams);
    if (rc == SA_OK && currentDesc >= 0 &&
        kviCsAddConnectionToSession(*SessionId, currentDesc) != SA_OK) {
        saHpiSessionClose(*SessionId);
        rc = SA_ERR_HPI_ERROR;
    }
    return rc;
}

SaErrorT eventGet(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout, SaHpiEventT *Event,
                  SaHpiRdrT *Rdr, SaHpiRptEntryT *RptEntry) noexcept
{
    for (;;) {
        const bool sliced = Timeout == SAHPI_TIMEOUT_BLOCK || Timeout > EVENT_SLICE_NS;
        const SaHpiTimeoutT wait = sliced ? EVENT_SLICE_NS : Timeout;
        const SaErrorT rc = saHpiEventGet(SessionId, wait, Event, Rdr, RptEntry);
        if (rc != SA_ERR_HPI_TIMEOUT || !sliced || kviHpidStopping || peerGone()) {
            return rc;
        }
        if (Timeout != SAHPI_TIMEOUT_BLOCK) {
            Timeout -= wait;
        }
    }
}

template <auto Fn> constexpr auto served = Fn;
template <> constexpr auto served<saHpiSessionOpen> = sessionOpen;
template <> constexpr auto served<saHpiEventGet> = eventGet;
#define KVI_HPID_ENUM_SERVED(Name, Call)                                                           \
    static_assert(std::is_same_v<decltype(&Name), decltype(kviWireRawFn(&Call))>);                 \
    template <> constexpr auto served<Call> = Name;
KVI_HPID_ENUM_CALLS(KVI_HPID_ENUM_SERVED)
#undef KVI_HPID_ENUM_SERVED

using Handler = bool (*)(KviWireBody &In, KviWireBody &Out, SaErrorT *Result);

struct AlignedBlock {
    alignas(KVI_WIRE_INVENTORY_ALIGN) SaHpiUint8T Bytes[KVI_WIRE_MAX_MSG];
};

// What both inventory requests start with; Size is the caller's buffer for a
// read and the size of the data that follows for a write.
struct InventoryRequest {
    SaHpiSessionIdT Session = 0;
    SaHpiResourceIdT Resource = 0;
    SaHpiEirIdT Eir = 0;
    SaHpiUint32T Size = 0;

    explicit InventoryRequest(KviWireBody &In) noexcept
    {
        In.get(Session);
        In.get(Resource);
        In.get(Eir);
        In.get(Size);
    }
};

bool inventoryRead(KviWireBody &In, KviWireBody &Out, SaErrorT *Result)
{
    const InventoryRequest r(In);
    if (!In.finished()) {
        return false;
    }
    // A caller's buffer larger than what travels is taken as that large: the
    // plug-in then reports the size it needs.
    std::vector<AlignedBlock> blocks(2);
    SaHpiUint32T actual = 0;
    SaHpiUint32T used = 0;
    const SaHpiUint32T size = r.Size < KVI_WIRE_INVENTORY_MAX ? r.Size : KVI_WIRE_INVENTORY_MAX;
    auto *tree = reinterpret_cast<SaHpiInventoryDataT *>(blocks[0].Bytes);
    *Result = saHpiEntityInventoryDataRead(r.Session, r.Resource, r.Eir, size, tree, &actual);
    if ((*Result == SA_OK || *Result == SA_ERR_HPI_DATA_LEN_INVALID) &&
        size >= sizeof(SaHpiInventoryDataT) &&
        kviWireInventoryFlatten(tree, tree, size, blocks[1].Bytes, size, &used) != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Inventory of resource %u does not keep to its buffer",
                 r.Resource);
        *Result = SA_ERR_HPI_ERROR;
        used = 0;
    }
    Out.put(actual);
    Out.put(used);
    Out.put(blocks[1].Bytes, used);
    return Out.ok();
}

bool inventoryWrite(KviWireBody &In, KviWireBody &Out, SaErrorT *Result)
{
    const InventoryRequest r(In);
    std::vector<AlignedBlock> block(1);
    In.get(block[0].Bytes, r.Size);
    if (!In.finished() || r.Size > sizeof block[0].Bytes ||
        kviWireInventoryRelocate(block[0].Bytes, r.Size) != SA_OK) {
        return false;
    }
    *Result = saHpiEntityInventoryDataWrite(
        r.Session, r.Resource, r.Eir, reinterpret_cast<SaHpiInventoryDataT *>(block[0].Bytes));
    return true;
}

struct Handlers {
    Handler Table[KVI_CPS_LAST_MSG_TYPE + 1] = {};
    constexpr Handlers()
    {
#define KVI_HPID_HANDLER(Code, Fn, Letters) Table[Code] = kviWireServe<served<Fn>, Letters>;
        KVI_WIRE_CALLS(KVI_HPID_HANDLER)
#undef KVI_HPID_HANDLER
        Table[KVI_ENTITY_INVENTORY_DATA_READ_REQ] = inventoryRead;
        Table[KVI_ENTITY_INVENTORY_DATA_WRITE_REQ] = inventoryWrite;
    }
};
const Handlers handlers;

KviCommRetCode serve(const KviMsgHdr *Header, void *Request, KviWireBody &Out, SaErrorT *Result)
{
    KviCommRetCode check = kviWireCheck(Request);
    if (check != KVI_MSG_SUCCESS) {
        return check;
    }
    const KviMsgTypeT type = Header->MsgType;
    Handler handler =
        type <= KVI_CPS_LAST_MSG_TYPE && type % 2 == 0 ? handlers.Table[type] : nullptr;
    if (handler == nullptr) {
        KVI_DLOG(KVI_LOG_DBG_H, "No call for message type 0x%04x", type);
        return KVI_MSG_UNABLE_TO_PROCESS;
    }
    KviWireBody in(Request, Header->MinHdr.Size);
    SaHpiUint8T layout = 0;
    in.get(layout);
    if (in.ok() && layout != KVI_WIRE_LAYOUT_TAG) {
        KVI_WLOG(KVI_LOG_WARN, "A client laid out as 0x%02x, not 0x%02x, was refused", layout,
                 KVI_WIRE_LAYOUT_TAG);
        return KVI_MSG_INVALID_PROTOCOL;
    }
    return in.ok() && handler(in, Out, Result) ? KVI_MSG_SUCCESS : KVI_MSG_INVALID_FORMAT;
}

} // namespace

void kviHpidServeMessage(SaHpiInt32T Desc, void *Request, void *Response) noexcept
{
    currentDesc = Desc;
    const auto *header = static_cast<const KviMsgHdr *>(Request);
    const KviMsgTypeT type = header->MsgType;
    kviWireStart(Response, static_cast<KviMsgTypeT>(type % 2 == 0 ? type + 1 : type),
                 header->MinHdr.SequenceNumber);
    KviWireBody out(Response, KVI_WIRE_MAX_MSG);
    auto *rsp = static_cast<KviRspMsgHdr *>(Response);
    SaErrorT result = SA_OK;
    const KviCommRetCode comm = serve(header, Request, out, &result);
    rsp->CommRetCode = comm;
    rsp->SaRetCode = comm == KVI_MSG_SUCCESS ? result : SA_ERR_HPI_ERROR;
    // A response that could not be understood carries no results.
    kviWireSeal(Response, comm == KVI_MSG_SUCCESS ? out.end() : sizeof(KviRspMsgHdr));
}

void kviHpidServeConnection(SaHpiInt32T Desc) noexcept
{
    KviCsSemaphore readSem;
    kviCsSemInitNoLogging(&readSem, 1);
    std::vector<AlignedBlock> buffers(2);
    while (!kviHpidStopping) {
        SaErrorT rc = kviCpsReadProtoMsg(Desc, READ_SLICE_MS, RETRIES, &readSem, KVI_WIRE_MAX_MSG,
                                         buffers[0].Bytes);
        if (rc == SA_ERR_HPI_TIMEOUT) {
            continue;
        }
        // Anything else that failed leaves the stream off a message boundary.
        if (rc != SA_OK) {
            break;
        }
        kviHpidServeMessage(Desc, buffers[0].Bytes, buffers[1].Bytes);
        if (kviCpsWriteProtoMsg(Desc, WRITE_TIMEOUT_MS, RETRIES, buffers[1].Bytes) != SA_OK) {
            break;
        }
    }
    kviCsCloseAllSessionsToConnection(Desc);
    kviCsCloseComm(Desc);
    kviCsSemDestroyNoLogging(&readSem);
}
