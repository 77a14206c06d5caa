// IPv4 stream sockets between the daemon and its clients. Each read or write
// is one system call; what it could not move is reported as a result code
// that the framing layer knows to retry, never finished here.
#include "kvi/KviProtocol.h"

#include <arpa/inet.h>
#include <cerrno>
#include <cstring>
#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <sys/socket.h>
#include <unistd.h>

#include "core/utils/KviTrace.h"

namespace
{
constexpr SaHpiInt32T LOWEST_PORT = 1024;

// Failures of accept that say nothing about the listening socket: the caller
// only has to try again.
bool isTransientAcceptError(int error)
{
    switch (error) {
    case EAGAIN:
    case ENETDOWN:
    case EPROTO:
    case ENOPROTOOPT:
    case EHOSTDOWN:
    case ENONET:
    case EHOSTUNREACH:
    case EOPNOTSUPP:
    case ENETUNREACH:
        return true;
    default:
        return false;
    }
}

// Server as a dotted address first, as a host name second.
SaErrorT resolveServer(const char *Server, in_addr *address)
{
    if (inet_aton(Server, address) != 0)
        return SA_OK;
    hostent entry;
    hostent *found = nullptr;
    char scratch[8192];
    int error = 0;
    if (gethostbyname_r(Server, &entry, scratch, sizeof scratch, &found, &error) != 0 ||
        found == nullptr || found->h_addrtype != AF_INET || found->h_addr_list[0] == nullptr) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Server name look up error (%d).", error);
        return SA_ERR_HPI_ERROR;
    }
    memcpy(address, found->h_addr_list[0], sizeof *address);
    return SA_OK;
}

sockaddr_in ipv4Address(in_addr address, SaHpiInt32T PortNum)
{
    sockaddr_in socketAddress{};
    socketAddress.sin_family = AF_INET;
    socketAddress.sin_port = htons(static_cast<uint16_t>(PortNum));
    socketAddress.sin_addr = address;
    return socketAddress;
}

// Result of a failed read or write: the closed or invalid socket, the
// transient cases the framing retries, and the rest. The texts name the
// direction.
struct TransferTexts {
    const char *notOpen;
    const char *wouldBlock;
    const char *interrupted;
    const char *failed;
};
constexpr TransferTexts READ_TEXTS{"Socket not open for read",
                                   "Read would block, returning timeout", "Read interrupted",
                                   "Protocol communication error reading message. %s"};
constexpr TransferTexts WRITE_TEXTS{"Socket not open for write",
                                    "Write would block, returning timeout", "Write interrupted",
                                    "Protocol communication error writing message. %s"};

SaErrorT transferFailure(int error, const TransferTexts &texts)
{
    if (error == EBADF) {
        KVI_DLOG(KVI_LOG_DBG_H, "%s", texts.notOpen);
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    if (error == EAGAIN || error == EWOULDBLOCK) {
        KVI_DLOG(KVI_LOG_DBG_H, "%s", texts.wouldBlock);
        return SA_ERR_HPI_TIMEOUT;
    }
    if (error == EINTR) {
        KVI_DLOG(KVI_LOG_DBG_H, "%s", texts.interrupted);
        return SA_ERR_HPI_TIMEOUT;
    }
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, texts.failed, strerror(error));
    return SA_ERR_HPI_ERROR;
}

SaErrorT refuseNegativeSize(SaHpiInt32T Size)
{
    KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid size %d.", Size);
    return SA_ERR_HPI_INVALID_PARAMS;
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCsOpenClientComm(SaHpiInt32T PortNum, const char *Server,
                                        SaHpiInt32T *Desc) noexcept
{
    KVI_TRACE("PortNum: %d", PortNum);
    KVI_NULL_CHECK(Server);
    KVI_NULL_CHECK(Desc);
    if (PortNum < LOWEST_PORT) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Invalid port number configured (%d).", PortNum);
        return SA_ERR_HPI_ERROR;
    }
    in_addr address;
    if (resolveServer(Server, &address) != SA_OK)
        return SA_ERR_HPI_ERROR;
    int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Error opening socket. Errno = %s.", strerror(errno));
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "socket created (Desc=%d)", fd);
    sockaddr_in peer = ipv4Address(address, PortNum);
    if (connect(fd, reinterpret_cast<sockaddr *>(&peer), sizeof peer) != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed call to connect to Desc (%d). Error = %s.", fd,
                 strerror(errno));
        close(fd);
        return SA_ERR_HPI_ERROR;
    }
    KVI_ILOG(KVI_LOG_INFO, "Client connected to server %s on port %d", Server, PortNum);
    *Desc = fd;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsOpenSvrComm(SaHpiInt32T PortNum, SaHpiInt32T MaxConnections,
                                     SaHpiInt32T *Desc) noexcept
{
    KVI_TRACE("PortNum: %d", PortNum);
    KVI_NULL_CHECK(Desc);
    int fd = socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    if (fd < 0) {
        // Logged at the fatal level, yet the daemon decides whether to go on.
        KVI_ELOG(KVI_LOG_ERR_FATAL, "Error opening socket. Error = %s.", strerror(errno));
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "socket created (Desc=%d)", fd);
    in_addr any;
    any.s_addr = htonl(INADDR_ANY);
    sockaddr_in local = ipv4Address(any, PortNum);
    int rc = bind(fd, reinterpret_cast<sockaddr *>(&local), sizeof local);
    if (rc != 0) {
        KVI_WLOG(KVI_LOG_WARN, "Failed call to bind to Desc (%d). Bind returned (%d). Error = %s.",
                 fd, rc, strerror(errno));
        close(fd);
        return SA_ERR_HPI_ERROR;
    }
    KVI_DLOG(KVI_LOG_DBG_L, "Socket bind successful.");
    if (listen(fd, MaxConnections) != 0) {
        KVI_WLOG(KVI_LOG_WARN, "Error listening for connections on the socket. Error = %s.",
                 strerror(errno));
        close(fd);
        return SA_ERR_HPI_ERROR;
    }
    *Desc = fd;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsAcceptConnection(SaHpiInt32T Desc, SaHpiInt32T *ConnDesc) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(ConnDesc);
    KVI_DLOG(KVI_LOG_DBG_L, "Desc is %d", Desc);
    int fd = accept4(Desc, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd < 0) {
        int error = errno;
        if (isTransientAcceptError(error)) {
            KVI_DLOG(KVI_LOG_DBG_H, "Reveived busy trying accept");
            return SA_ERR_HPI_BUSY;
        }
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Error accepting connection. Error = %s.", strerror(error));
        return SA_ERR_HPI_ERROR;
    }
    *ConnDesc = fd;
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsSetSockNbio(SaHpiInt32T Desc) noexcept
{
    KVI_TRACE("");
    if (fcntl(Desc, F_SETFL, O_NONBLOCK) != 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Desc is %d, Failed to set socket nonblocking: %s\n", Desc,
                 strerror(errno));
        return SA_ERR_HPI_ERROR;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsWriteMessage(SaHpiInt32T Desc, const void *Buf, SaHpiInt32T Size) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Buf);
    if (Size < 0)
        return refuseNegativeSize(Size);
    // A peer that went away must cost this call an error, not the daemon its
    // life through SIGPIPE.
    ssize_t written = send(Desc, Buf, static_cast<size_t>(Size), MSG_NOSIGNAL);
    int error = errno;
    KVI_DLOG(KVI_LOG_DBG_L, "Write count = %d, wrote %d.", Size, static_cast<int>(written));
    if (written < 0)
        return transferFailure(error, WRITE_TEXTS);
    if (written != Size) {
        KVI_WLOG(KVI_LOG_WARN, "Warning - Did not write the size sent.");
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsReadMessage(SaHpiInt32T Desc, void *Buf, SaHpiInt32T Size,
                                     SaHpiInt32T *Count) noexcept
{
    KVI_TRACE("");
    KVI_NULL_CHECK(Buf);
    KVI_NULL_CHECK(Count);
    *Count = 0;
    if (Size < 0)
        return refuseNegativeSize(Size);
    ssize_t got = read(Desc, Buf, static_cast<size_t>(Size));
    int error = errno;
    KVI_DLOG(KVI_LOG_DBG_L, "Read count = %d. Read %d", Size, static_cast<int>(got));
    if (got < 0)
        return transferFailure(error, READ_TEXTS);
    if (got == 0) {
        KVI_DLOG(KVI_LOG_DBG_H, "Read returned 0, socket is closed. Desc is %d", Desc);
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    *Count = static_cast<SaHpiInt32T>(got);
    return SA_OK;
}

KVI_EXPORT SaErrorT kviCsCloseComm(SaHpiInt32T Desc) noexcept
{
    KVI_TRACE("");
    KVI_DLOG(KVI_LOG_DBG_L, "Closing down socket (%#x) interface.", static_cast<unsigned>(Desc));
    if (close(Desc) == 0)
        return SA_OK;
    int error = errno;
    KVI_WLOG(KVI_LOG_WARN, "Error closing communication descriptor %d. (%d - %s)", Desc, error,
             strerror(error));
    if (error == EBADF) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid file descriptor to close.");
        return SA_OK;
    }
    return SA_ERR_HPI_ERROR;
}

} // extern "C"
