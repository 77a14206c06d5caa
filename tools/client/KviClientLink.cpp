// Connections to the daemon. A call takes an idle connection or opens a new
// one, and gives it back when its response has come. A connection that
// broke, or whose response did not come in time (it may still come, out of
// turn), is closed; so are the idle ones then, since a daemon that went
// away took them all.
#include "KviClientLink.h"

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <stdlib.h>
#include <sys/socket.h>

#include <atomic>
#include <mutex>
#include <string>
#include <vector>

#include "coder/KviParamCoder.h"

namespace
{

constexpr SaHpiUint32T RETRIES = 3;
constexpr SaHpiUint32T WRITE_TIMEOUT_MS = 5000;
constexpr SaHpiInt32T DEFAULT_CALL_TIMEOUT_MS = 30000;
constexpr SaHpiInt32T DEFAULT_PORT = 4743;

struct Link {
    SaHpiInt32T Fd = -1;
    unsigned Generation = 0;
    KviCsSemaphore ReadSem;
};

struct Client {
    std::mutex Mutex;
    bool Initialized = false;
    unsigned Generation = 0;
    std::vector<Link *> Idle;
    std::string Server;
    SaHpiInt32T Port = DEFAULT_PORT;
    SaHpiInt32T CallTimeout = DEFAULT_CALL_TIMEOUT_MS;
    bool LogOpened = false;
};

Client client;
std::atomic<SaHpiUint16T> sequence{0};

SaHpiInt32T envNumber(const char *Name, SaHpiInt32T Default) noexcept
{
    const char *text = getenv(Name);
    char *end = nullptr;
    long value = text != nullptr ? strtol(text, &end, 10) : 0;
    return text != nullptr && *text != '\0' && *end == '\0' && value > 0 && value <= 0x7fffffff
               ? static_cast<SaHpiInt32T>(value)
               : Default;
}

void closeLink(Link *L) noexcept
{
    kviCsCloseComm(L->Fd);
    kviCsSemDestroyNoLogging(&L->ReadSem);
    delete L;
}

// Closes the idle links; the caller holds the mutex.
void dropIdle() noexcept
{
    for (Link *l : client.Idle) {
        closeLink(l);
    }
    client.Idle.clear();
    ++client.Generation;
}

SaErrorT takeLink(Link **Taken) noexcept
{
    std::string server;
    SaHpiInt32T port;
    unsigned generation;
    {
        std::lock_guard<std::mutex> lock(client.Mutex);
        if (!client.Initialized) {
            return SA_ERR_HPI_UNINITIALIZED;
        }
        if (!client.Idle.empty()) {
            *Taken = client.Idle.back();
            client.Idle.pop_back();
            return SA_OK;
        }
        server = client.Server;
        port = client.Port;
        generation = client.Generation;
    }
    auto *l = new (std::nothrow) Link;
    if (l == nullptr) {
        return SA_ERR_HPI_OUT_OF_SPACE;
    }
    if (kviCsOpenClientComm(port, server.c_str(), &l->Fd) != SA_OK) {
        delete l;
        return SA_ERR_HPI_NO_RESPONSE;
    }
    int one = 1;
    setsockopt(l->Fd, IPPROTO_TCP, TCP_NODELAY, &one, sizeof one);
    kviCsSetSockNbio(l->Fd);
    kviCsSemInitNoLogging(&l->ReadSem, 1);
    l->Generation = generation;
    *Taken = l;
    return SA_OK;
}

void giveLink(Link *L, bool Healthy) noexcept
{
    std::lock_guard<std::mutex> lock(client.Mutex);
    if (Healthy && client.Initialized && L->Generation == client.Generation) {
        client.Idle.push_back(L);
        return;
    }
    closeLink(L);
    if (!Healthy) {
        dropIdle();
    }
}

SaErrorT commResult(SaHpiUint16T CommRetCode) noexcept
{
    switch (CommRetCode) {
    case KVI_MSG_SUCCESS:
        return SA_OK;
    case KVI_MSG_UNABLE_TO_PROCESS:
        return SA_ERR_HPI_UNSUPPORTED_API;
    default:
        return SA_ERR_HPI_ERROR;
    }
}

// One request and its response over L; false when L can no longer be used.
bool transfer(Link *L, void *Request, void *Response, SaHpiInt32T TimeoutMs, SaErrorT *Rc) noexcept
{
    auto *request = static_cast<KviMsgHdr *>(Request);
    const auto *response = static_cast<const KviRspMsgHdr *>(Response);
    request->MinHdr.SequenceNumber = ++sequence;
    *Rc = SA_ERR_HPI_NO_RESPONSE;
    if (kviCpsWriteProtoMsg(L->Fd, WRITE_TIMEOUT_MS, RETRIES, Request) != SA_OK ||
        kviCpsReadProtoMsg(L->Fd, TimeoutMs, RETRIES, &L->ReadSem, KVI_WIRE_MAX_MSG, Response) !=
            SA_OK) {
        return false;
    }
    if (kviWireCheck(Response) != KVI_MSG_SUCCESS ||
        response->MsgHdr.MinHdr.Size < sizeof(KviRspMsgHdr) ||
        response->MsgHdr.MsgType != request->MsgType + 1 ||
        response->MsgHdr.MinHdr.SequenceNumber != request->MinHdr.SequenceNumber) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "The daemon's response to 0x%04x is not one",
                 request->MsgType);
        *Rc = SA_ERR_HPI_ERROR;
        return false;
    }
    *Rc = commResult(response->CommRetCode);
    return true;
}

} // namespace

SaErrorT kviClientInitialize() noexcept
{
    std::lock_guard<std::mutex> lock(client.Mutex);
    if (client.Initialized) {
        return SA_ERR_HPI_DUPLICATE;
    }
    const char *server = getenv("KVI_HPI_SERVER");
    client.Server = server != nullptr && *server != '\0' ? server : "127.0.0.1";
    client.Port = envNumber("KVI_HPI_PORT", DEFAULT_PORT);
    client.CallTimeout = envNumber("KVI_HPI_TIMEOUT", DEFAULT_CALL_TIMEOUT_MS);
    const char *log = getenv("KVI_LIB_LOG_LOCATION");
    if (log != nullptr && *log != '\0') {
        kviCsLogInitHelper(log, getenv("KVI_LIB_LOG_LEVEL"));
        client.LogOpened = true;
    }
    client.Initialized = true;
    return SA_OK;
}

SaErrorT kviClientFinalize() noexcept
{
    std::lock_guard<std::mutex> lock(client.Mutex);
    if (!client.Initialized) {
        return SA_ERR_HPI_UNINITIALIZED;
    }
    client.Initialized = false;
    dropIdle();
    if (client.LogOpened) {
        kviCsLogClose();
        client.LogOpened = false;
    }
    return SA_OK;
}

SaHpiInt32T kviClientCallTimeout() noexcept
{
    std::lock_guard<std::mutex> lock(client.Mutex);
    return client.CallTimeout;
}

SaErrorT kviClientExchange(void *Request, void *Response, SaHpiInt32T TimeoutMs) noexcept
{
    Link *link = nullptr;
    SaErrorT rc = takeLink(&link);
    if (rc != SA_OK) {
        return rc;
    }
    giveLink(link, transfer(link, Request, Response, TimeoutMs, &rc));
    return rc;
}
