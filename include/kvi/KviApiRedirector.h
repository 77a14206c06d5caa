/* The daemon's one-time set-up of the HPI front end. The saHpi* entry points
 * themselves are declared in SaHpi.h. */
#ifndef KVI_API_REDIRECTOR_H
#define KVI_API_REDIRECTOR_H

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

/* Called once by the daemon after it loads the library and before any saHpi*
 * call: creates the lock of the call gate and initializes the plug-in
 * manager. Nothing is undone when a step fails. */
KVI_API SaErrorT kviDsApiRedirectorInitialize(void) KVI_NOEXCEPT;

/* The library's own forms of saHpiSubscribe and saHpiEventGet, for a daemon
 * that serves clients elsewhere. kviDsSubscribe starts a session's
 * subscription (*InitialEventNumber 0: from the next event on; it is answered
 * with the number the subscription starts after) or resumes one at
 * *InitialEventNumber. kviDsEventGet waits as Timeout says
 * (SAHPI_TIMEOUT_IMMEDIATE, SAHPI_TIMEOUT_BLOCK or nanoseconds) for the
 * session's next event and tells its number; SA_ERR_HPI_DATA_TRUNCATED
 * delivers an event that followed events the session missed. Rdr and
 * RptEntry may be NULL; when given, a record that cannot be appended has
 * RdrType SAHPI_NO_RECORD and an entry that cannot be appended
 * ResourceCapabilities 0. */
KVI_API SaErrorT kviDsSubscribe(SaHpiSessionIdT SessionId, SaHpiBoolT ProvideActiveAlarms,
                                SaHpiUint32T *InitialEventNumber) KVI_NOEXCEPT;
KVI_API SaErrorT kviDsEventGet(SaHpiSessionIdT SessionId, SaHpiTimeoutT Timeout, SaHpiEventT *Event,
                               SaHpiUint32T *EventNumber, SaHpiRdrT *Rdr,
                               SaHpiRptEntryT *RptEntry) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
