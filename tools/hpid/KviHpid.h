// What the daemon's units share: serving one client connection.
#ifndef KVI_HPID_H
#define KVI_HPID_H

#include <atomic>

#include "KviDaemonCore.h"

// Set when the daemon is stopping: connections finish the request at hand
// and close.
extern std::atomic<bool> kviHpidStopping;

// Serves the requests of one connection until the peer goes, sends
// something that cannot be read, or the daemon stops. Closes the
// connection's sessions and the descriptor before returning.
void kviHpidServeConnection(SaHpiInt32T Desc) noexcept;

// Serves one request already read into Request (header checked by
// kviWireCheck or not) and builds its response in Response (65535 bytes).
// Exposed for the decoder's fuzz target; Desc is the connection the
// request came on, -1 when none.
void kviHpidServeMessage(SaHpiInt32T Desc, void *Request, void *Response) noexcept;

// The calls that take an enumeration by value, called with the number the
// client sent (KviHpidEnums.c).
#define KVI_HPID_ENUM_CALLS(X)                                                                     \
    X(kviHpidResourceSeveritySet, saHpiResourceSeveritySet)                                        \
    X(kviHpidHotSwapActionRequest, saHpiHotSwapActionRequest)                                      \
    X(kviHpidResourcePowerStateSet, saHpiResourcePowerStateSet)                                    \
    X(kviHpidHotSwapIndicatorStateSet, saHpiHotSwapIndicatorStateSet)                              \
    X(kviHpidParmControl, saHpiParmControl)                                                        \
    X(kviHpidResourceResetStateSet, saHpiResourceResetStateSet)
#define KVI_HPID_ENUM_DECLARE(Name, Call)                                                          \
    extern "C" SaErrorT Name(SaHpiSessionIdT, SaHpiResourceIdT, unsigned int) noexcept;
KVI_HPID_ENUM_CALLS(KVI_HPID_ENUM_DECLARE)
#undef KVI_HPID_ENUM_DECLARE

#endif
