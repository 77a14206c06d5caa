// The client library's connections to the daemon: a pool of them, so that
// threads of one client call at once (a connection carries one call at a
// time, and a blocked event wait keeps its connection to itself).
#ifndef KVI_CLIENT_LINK_H
#define KVI_CLIENT_LINK_H

#include "SaHpi.h"

// Reads the daemon's address from the environment and opens the log named
// by KVI_LIB_LOG_LOCATION. SA_ERR_HPI_DUPLICATE when already initialized.
SaErrorT kviClientInitialize() noexcept;
// Closes every idle connection; calls in flight end on their own.
SaErrorT kviClientFinalize() noexcept;

// The time a call waits for its response when it names none (milliseconds).
SaHpiInt32T kviClientCallTimeout() noexcept;

// Sends the sealed Request and reads its response into Response (65535
// bytes), waiting up to TimeoutMs (-1 without limit). SA_OK when a response
// came whose SaRetCode and results can be read; SA_ERR_HPI_UNINITIALIZED,
// SA_ERR_HPI_NO_RESPONSE (no connection, or it broke: the next call
// connects again), SA_ERR_HPI_UNSUPPORTED_API (the daemon has no such
// call), SA_ERR_HPI_ERROR (the daemon could not read the request, or the
// response is not one).
SaErrorT kviClientExchange(void *Request, void *Response, SaHpiInt32T TimeoutMs) noexcept;

#endif
