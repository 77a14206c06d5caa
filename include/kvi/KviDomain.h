/* The domain the library serves. Only the default domain (0) exists; its
 * resource presence table is the one of KviRpt.h. */
#ifndef KVI_DOMAIN_H
#define KVI_DOMAIN_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviRpt.h"

KVI_EXTERN_C_BEGIN

/* Sets up the default domain and its empty table; once per process. */
KVI_API SaErrorT kviCsDomainInitialize(void) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetRptContainerByDomainId(SaHpiDomainIdT DomainId,
                                                KviCsRptContainerT **RptContainer) KVI_NOEXCEPT;
/* Always the single domain 0; a ListSize of 0 reports the needed size. */
KVI_API SaErrorT kviCsGetDomainList(SaHpiUint32T ListSize, SaHpiDomainIdT *DomainList,
                                    SaHpiUint32T *NumDomains) KVI_NOEXCEPT;

/* The domain's auto-insert timeout in nanoseconds: how long a FRU that
 * entered SAHPI_HS_STATE_INSERTION_PENDING waits before the plug-in's own
 * insertion policy makes it active, unless a client took control first.
 * SAHPI_TIMEOUT_IMMEDIATE: at once; SAHPI_TIMEOUT_BLOCK: never. Plug-ins read
 * it when a FRU enters the pending state; clients set it with
 * saHpiAutoInsertTimeoutSet, and the daemon's copy is restored at start. */
#define KVI_CS_DEFAULT_AUTO_INSERT_TIMEOUT ((SaHpiTimeoutT)5000000000LL)
KVI_API SaErrorT kviCsAutoInsertTimeoutGet(SaHpiDomainIdT DomainId,
                                           SaHpiTimeoutT *Timeout) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
