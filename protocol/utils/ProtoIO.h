// Private parts of the message framing: the calls it makes to the socket
// layer and the kernel, replaceable so that tests can script retries and
// interruptions. Nothing here is exported.
#pragma once

#include <poll.h>

#include "kvi/KviProtocol.h"

struct KviCpsIoOps {
    SaErrorT (*readMessage)(SaHpiInt32T Desc, void *Buf, SaHpiInt32T Size,
                            SaHpiInt32T *Count) noexcept;
    SaErrorT (*writeMessage)(SaHpiInt32T Desc, const void *Buf, SaHpiInt32T Size) noexcept;
    int (*pollDesc)(struct pollfd *Fds, nfds_t Count, int TimeoutMs);
};
extern KviCpsIoOps kviCpsIoOps;
extern const KviCpsIoOps kviCpsDefaultIoOps;
