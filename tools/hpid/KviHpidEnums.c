/* The calls that take an enumeration by value, for the numbers clients send.
 * A client may send any number; the call refuses what is not one of the
 * enumeration's values. In C an enumeration is its integer type, so the
 * number reaches the call unchanged, where C++ could not hold it as the
 * enumeration at all. */
#include "SaHpi.h"

#define KVI_HPID_ENUM_CALL(Name, Call)                                                             \
    SaErrorT Name(SaHpiSessionIdT SessionId, SaHpiResourceIdT ResourceId, unsigned int Value)      \
    {                                                                                              \
        return Call(SessionId, ResourceId, Value);                                                 \
    }

KVI_HPID_ENUM_CALL(kviHpidResourceSeveritySet, saHpiResourceSeveritySet)
KVI_HPID_ENUM_CALL(kviHpidHotSwapActionRequest, saHpiHotSwapActionRequest)
KVI_HPID_ENUM_CALL(kviHpidResourcePowerStateSet, saHpiResourcePowerStateSet)
KVI_HPID_ENUM_CALL(kviHpidHotSwapIndicatorStateSet, saHpiHotSwapIndicatorStateSet)
KVI_HPID_ENUM_CALL(kviHpidParmControl, saHpiParmControl)
KVI_HPID_ENUM_CALL(kviHpidResourceResetStateSet, saHpiResourceResetStateSet)
