// Feeds arbitrary bytes, as a peer would send them before hanging up, through
// a socket pair into the message reader, one message after another. Whatever
// the bytes, the reader must stay inside its 65535-byte buffer, must return
// without waiting (every byte is there or the peer is gone), and may only
// accept a message whose bytes are exactly the next ones of the stream.
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <sys/socket.h>
#include <unistd.h>

#include "kvi/KviProtocol.h"

namespace
{
constexpr SaHpiInt32T BUFFER_SIZE = 65535;

void require(bool condition)
{
    if (!condition)
        abort();
}

KviCsSemaphore &readSem()
{
    static KviCsSemaphore sem = [] {
        KviCsSemaphore s;
        require(kviCsSemInitNoLogging(&s, 1) == SA_OK);
        return s;
    }();
    return sem;
}

// The peer's side: everything written at once, then closed.
int connectionCarrying(const uint8_t *data, size_t size)
{
    int ends[2];
    require(socketpair(AF_UNIX, SOCK_STREAM, 0, ends) == 0);
    int bufferSize = 1 << 20;
    require(setsockopt(ends[0], SOL_SOCKET, SO_SNDBUF, &bufferSize, sizeof bufferSize) == 0);
    for (size_t sent = 0; sent < size;) {
        ssize_t n = write(ends[0], data + sent, size - sent);
        require(n > 0);
        sent += static_cast<size_t>(n);
    }
    close(ends[0]);
    return ends[1];
}
} // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size)
{
    if (size > 200000)
        return 0;
    int desc = connectionCarrying(data, size);
    // Exactly the buffer's size on the heap, so a byte past it is caught.
    auto *buf = static_cast<uint8_t *>(malloc(BUFFER_SIZE));
    require(buf != nullptr);
    size_t offset = 0;
    SaErrorT rc;
    while ((rc = kviCpsReadProtoMsg(desc, 1000, 1, &readSem(), BUFFER_SIZE, buf)) == SA_OK) {
        SaHpiUint16T msgSize;
        memcpy(&msgSize, buf + offsetof(KviMinMsgHdr, Size), sizeof msgSize);
        require(msgSize >= sizeof(KviMinMsgHdr) && offset + msgSize <= size);
        require(memcmp(buf, data + offset, msgSize) == 0);
        offset += msgSize;
    }
    // The stream ended cleanly, or in the middle of a header or a body, or
    // announced a size the header cannot have.
    require(rc == SA_ERR_HPI_INVALID_REQUEST || rc == SA_ERR_HPI_INVALID_DATA ||
            rc == SA_ERR_HPI_NO_RESPONSE);
    require(rc != SA_ERR_HPI_INVALID_REQUEST || offset == size);
    free(buf);
    close(desc);
    return 0;
}
