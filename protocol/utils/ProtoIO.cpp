// Moves one whole protocol message over a connection: a readiness wait, then
// the header and the body under the connection's read semaphore, or the whole
// message in writes that are retried. The retry counts and their equality
// tests are kept exactly as clients and the daemon have always seen them.
#include "protocol/utils/ProtoIO.h"

#include <cerrno>
#include <climits>
#include <cstdint>
#include <cstring>
#include <ctime>

#include "core/utils/KviTrace.h"

const KviCpsIoOps kviCpsDefaultIoOps{kviCsReadMessage, kviCsWriteMessage, poll};
KviCpsIoOps kviCpsIoOps = kviCpsDefaultIoOps;

namespace
{
constexpr SaHpiInt32T MIN_HEADER_SIZE = sizeof(KviMinMsgHdr);
constexpr SaHpiUint32T READ_SEM_TIMEOUT = 100;

// One wait of at most TimeoutMs (negative: no limit) for Events on Desc.
// Expiry and interruption are both SA_ERR_HPI_TIMEOUT; Interrupted tells
// them apart.
SaErrorT waitOnce(SaHpiInt32T Desc, short Events, int TimeoutMs, bool *Interrupted)
{
    *Interrupted = false;
    pollfd entry{Desc, Events, 0};
    // poll skips a negative descriptor rather than refusing it.
    int status = Desc < 0 ? 1 : kviCpsIoOps.pollDesc(&entry, 1, TimeoutMs);
    int error = errno;
    if (Desc < 0 || (status > 0 && (entry.revents & POLLNVAL) != 0) ||
        (status < 0 && error == EBADF)) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid file descriptor to select");
        return SA_ERR_HPI_INVALID_REQUEST;
    }
    if (status < 0 && error == EINTR) {
        *Interrupted = true;
        return SA_ERR_HPI_TIMEOUT;
    }
    if (status < 0) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Select failed. status=%d, errno=%d(%s)", status, error,
                 strerror(error));
        return SA_ERR_HPI_ERROR;
    }
    return status == 0 ? SA_ERR_HPI_TIMEOUT : SA_OK;
}

// Waits for input; an interruption starts the same wait again.
SaErrorT waitForInput(SaHpiInt32T Desc, int TimeoutMs)
{
    bool interrupted = true;
    SaErrorT rc = SA_OK;
    while (interrupted)
        rc = waitOnce(Desc, POLLIN, TimeoutMs, &interrupted);
    return rc;
}

long long monotonicNs()
{
    timespec now;
    clock_gettime(CLOCK_MONOTONIC, &now);
    return static_cast<long long>(now.tv_sec) * 1000000000LL + now.tv_nsec;
}

// The caller's limit on the whole read. The reads wait for their bytes only
// within what is left of it, so a peer that sends a header and then stalls,
// or a second reader that took the input first, holds nobody past it. What
// is left is rounded up, so the limit is never cut short either.
class ReadDeadline
{
  public:
    explicit ReadDeadline(SaHpiInt32T TimeOut) : limit_(TimeOut < 0 ? -1 : TimeOut) {}
    int remainingMs() const
    {
        if (limit_ < 0)
            return -1;
        long long left = start_ + limit_ * 1000000LL - monotonicNs();
        return left > 0 ? static_cast<int>((left + 999999) / 1000000) : 0;
    }
    int limitMs() const { return limit_; }

  private:
    int limit_;
    long long start_ = monotonicNs();
};

// One read of exactly Size bytes. NumRetries is only a guard: 0 refuses
// whatever was read.
SaErrorT readData(SaHpiInt32T Desc, SaHpiUint32T NumRetries, SaHpiInt32T Size, void *Buf,
                  SaHpiInt32T *Count, const ReadDeadline &Deadline)
{
    KVI_TRACE("Size: %d", Size);
    *Count = 0;
    SaErrorT rc = waitForInput(Desc, Deadline.remainingMs());
    if (rc == SA_OK)
        rc = kviCpsIoOps.readMessage(Desc, Buf, Size, Count);
    if (rc == SA_ERR_HPI_INVALID_REQUEST) {
        KVI_DLOG(KVI_LOG_DBG_H, "Socket is closed");
        return rc;
    }
    if (rc == SA_ERR_HPI_TIMEOUT)
        return rc;
    if (rc != SA_OK) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to read from socket: %d", rc);
        return SA_ERR_HPI_ERROR;
    }
    if (NumRetries == 0) {
        KVI_WLOG(KVI_LOG_WARN, "Exhausted read message retries.");
        return SA_ERR_HPI_NO_RESPONSE;
    }
    if (*Count < Size) {
        KVI_DLOG(KVI_LOG_DBG_H, "Invalid data recieved. Expected %d bytes, recieved %d bytes", Size,
                 *Count);
        return SA_ERR_HPI_DATA_TRUNCATED;
    }
    return SA_OK;
}

// A peer controls the header's Size: it must cover the header itself and fit
// the caller's buffer before a byte more is read.
SaErrorT checkAnnouncedSize(SaHpiUint16T MsgSize, SaHpiInt32T BufSize)
{
    if (MsgSize < MIN_HEADER_SIZE) {
        KVI_WLOG(KVI_LOG_WARN, "Message size %u is below the header size %d", MsgSize,
                 MIN_HEADER_SIZE);
        return SA_ERR_HPI_INVALID_DATA;
    }
    if (MsgSize > BufSize) {
        KVI_WLOG(KVI_LOG_WARN, "Message size %u exceeds the buffer size %d", MsgSize, BufSize);
        return SA_ERR_HPI_INVALID_DATA;
    }
    return SA_OK;
}

// Header, then body; called with the read semaphore held.
SaErrorT readHeaderAndBody(SaHpiInt32T Desc, SaHpiUint32T NumRetries, SaHpiInt32T Size,
                           SaHpiUint8T *Buf, const ReadDeadline &Deadline)
{
    SaHpiInt32T count = 0;
    SaErrorT rc = readData(Desc, NumRetries, MIN_HEADER_SIZE, Buf, &count, Deadline);
    if (rc == SA_ERR_HPI_DATA_TRUNCATED) {
        KVI_WLOG(KVI_LOG_WARN, "Message header was too short");
        return SA_ERR_HPI_INVALID_DATA;
    }
    if (rc != SA_OK)
        return rc;
    SaHpiUint16T msgSize;
    memcpy(&msgSize, Buf + offsetof(KviMinMsgHdr, Size), sizeof msgSize);
    rc = checkAnnouncedSize(msgSize, Size);
    // A message that is all header has nothing more to read; a read of no
    // bytes would look like the peer closing.
    if (rc != SA_OK || msgSize == MIN_HEADER_SIZE)
        return rc;
    rc = readData(Desc, NumRetries, msgSize - MIN_HEADER_SIZE, Buf + MIN_HEADER_SIZE, &count,
                  Deadline);
    if (rc == SA_ERR_HPI_TIMEOUT || rc == SA_ERR_HPI_DATA_TRUNCATED)
        KVI_WLOG(KVI_LOG_WARN, "Got the message header, but not the message payload");
    return rc == SA_OK ? SA_OK : SA_ERR_HPI_NO_RESPONSE;
}

// The write side's readiness loop; the count of waits that expired or were
// interrupted goes to *Waits. 64 bits, so that no NumRetries makes it wrap.
SaErrorT waitToWrite(SaHpiInt32T Desc, SaHpiUint32T TimeOut, SaHpiUint32T NumRetries,
                     uint64_t *Waits)
{
    int timeoutMs = TimeOut > INT_MAX ? INT_MAX : static_cast<int>(TimeOut);
    for (*Waits = 0;;) {
        bool interrupted = false;
        SaErrorT rc = waitOnce(Desc, POLLOUT, timeoutMs, &interrupted);
        if (rc != SA_ERR_HPI_TIMEOUT)
            return rc;
        if (++*Waits > NumRetries)
            return SA_OK;
    }
}

// The write loop; the count of retried writes goes to *Retries.
SaErrorT writeWhole(SaHpiInt32T Desc, SaHpiUint32T NumRetries, const void *Buf,
                    SaHpiUint16T MsgSize, uint64_t *Retries)
{
    for (*Retries = 0;;) {
        SaErrorT rc = kviCpsIoOps.writeMessage(Desc, Buf, MsgSize);
        if (rc == SA_OK)
            return SA_OK;
        if (rc == SA_ERR_HPI_INVALID_REQUEST) {
            KVI_DLOG(KVI_LOG_DBG_H, "Socket is closed");
            return rc;
        }
        if (rc != SA_ERR_HPI_TIMEOUT && rc != SA_ERR_HPI_DATA_TRUNCATED) {
            KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Failed to write to socket: %d", rc);
            return SA_ERR_HPI_ERROR;
        }
        KVI_DLOG(KVI_LOG_DBG_H, "Retrying write: %d", rc);
        if (++*Retries > NumRetries)
            return SA_OK;
    }
}
} // namespace

extern "C" {

KVI_EXPORT SaErrorT kviCpsReadProtoMsg(SaHpiInt32T Desc, SaHpiInt32T TimeOut,
                                       SaHpiUint32T NumRetries, KviCsSemaphore *Sem,
                                       SaHpiInt32T Size, void *Buf) noexcept
{
    KVI_TRACE("Desc: %d, TimeOut: %d", Desc, TimeOut);
    KVI_NULL_CHECK(Sem);
    KVI_NULL_CHECK(Buf);
    if (Size < MIN_HEADER_SIZE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Buffer size %d cannot hold a message header", Size);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    ReadDeadline deadline(TimeOut);
    SaErrorT rc = waitForInput(Desc, deadline.limitMs());
    if (rc == SA_ERR_HPI_TIMEOUT)
        trace.exitMessage("Timeout");
    if (rc != SA_OK)
        return rc;
    KVI_SEM_GUARD(reading, Sem, READ_SEM_TIMEOUT);
    if (!reading.held())
        return reading.result() == SA_ERR_HPI_TIMEOUT ? SA_ERR_HPI_TIMEOUT : SA_ERR_HPI_ERROR;
    return readHeaderAndBody(Desc, NumRetries, Size, static_cast<SaHpiUint8T *>(Buf), deadline);
}

KVI_EXPORT SaErrorT kviCpsWriteProtoMsg(SaHpiInt32T Desc, SaHpiUint32T TimeOut,
                                        SaHpiUint32T NumRetries, const void *Buf) noexcept
{
    KVI_TRACE("Desc: %d, TimeOut: %u", Desc, TimeOut);
    KVI_NULL_CHECK(Buf);
    SaHpiUint16T msgSize;
    memcpy(&msgSize, static_cast<const SaHpiUint8T *>(Buf) + offsetof(KviMinMsgHdr, Size),
           sizeof msgSize);
    if (msgSize < MIN_HEADER_SIZE) {
        KVI_ELOG(KVI_LOG_ERR_NONFATAL, "Message size %u is below the header size %d", msgSize,
                 MIN_HEADER_SIZE);
        return SA_ERR_HPI_INVALID_PARAMS;
    }
    uint64_t attempts = 0;
    SaErrorT rc = waitToWrite(Desc, TimeOut, NumRetries, &attempts);
    if (rc != SA_OK)
        return rc;
    // Equality on purpose, in both places: readiness or success on the last
    // permitted attempt counts as exhaustion, running out does not.
    if (attempts == NumRetries) {
        KVI_WLOG(KVI_LOG_WARN, "Exhausted retries to select for write message");
        return SA_ERR_HPI_NO_RESPONSE;
    }
    rc = writeWhole(Desc, NumRetries, Buf, msgSize, &attempts);
    if (rc != SA_OK)
        return rc;
    if (attempts == NumRetries) {
        KVI_WLOG(KVI_LOG_WARN, "Exhausted write message retries.");
        return SA_ERR_HPI_NO_RESPONSE;
    }
    return SA_OK;
}

} // extern "C"
