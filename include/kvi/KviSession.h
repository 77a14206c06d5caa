/* The session table: every HPI session that clients have opened, which client
 * connection owns it, and where it stands in the event queue.
 *
 * Session ids start at KVI_CS_SESSION_OFFSET and are never reused; the table
 * holds at most KVI_CS_MAX_SESSIONS open sessions. Every session belongs to the
 * default domain. All calls are safe from any thread. */
#ifndef KVI_SESSION_H
#define KVI_SESSION_H

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

#define KVI_CS_MAX_SESSIONS 100
#define KVI_CS_SESSION_OFFSET 1000

/* One slot of the table. */
typedef struct {
    SaHpiBoolT InUse;        /* the slot holds an open session */
    SaHpiDomainIdT DomainId; /* always the default domain once opened */
    SaHpiInt32T ConnDesc;    /* owning client connection; 0 when none */
    SaHpiBoolT EventSubscribed;
    SaHpiUint32T LastEventRead; /* number of the last event this session read */
    SaHpiSessionIdT SessionId;
} KviSessionIdsT;

/* Library start-up: creates the table's semaphore and clears the slots. Ids
 * already handed out stay spent. */
KVI_API SaErrorT kviCsSessionInitialize(void) KVI_NOEXCEPT;

/* Opens a session in DomainId (only the default domain exists). A full table
 * gives SA_ERR_HPI_DATA_EX_LIMITS. */
KVI_API SaErrorT kviCsSessionOpen(SaHpiDomainIdT DomainId, SaHpiSessionIdT *SessionId) KVI_NOEXCEPT;

/* SA_OK for an open session, SA_ERR_HPI_INVALID_SESSION otherwise. */
KVI_API SaErrorT kviCsSessionValidate(SaHpiSessionIdT SessionId) KVI_NOEXCEPT;

/* Closes one session and wakes event readers blocked on it. Closing an id
 * that is not open gives SA_ERR_HPI_DUPLICATE. */
KVI_API SaErrorT kviCsSessionClose(SaHpiSessionIdT SessionId) KVI_NOEXCEPT;

KVI_API SaErrorT kviCsGetDomainFromSession(SaHpiSessionIdT SessionId,
                                           SaHpiDomainIdT *Domain) KVI_NOEXCEPT;

/* The daemon's connection handling: tie a session to the client connection
 * that opened it, look the connection up, and close every session of a
 * connection that went away. */
KVI_API SaErrorT kviCsAddConnectionToSession(SaHpiSessionIdT SessionId,
                                             SaHpiInt32T ConnDesc) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetConnectionFromSession(SaHpiSessionIdT SessionId,
                                               SaHpiInt32T *ConnDesc) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsCloseAllSessionsToConnection(SaHpiInt32T ConnDesc) KVI_NOEXCEPT;

/* Library finalization: closes every open session. */
KVI_API SaErrorT kviCsCloseAllSessions(void) KVI_NOEXCEPT;

/* The event queue's bookkeeping for a subscribed session. */
KVI_API SaErrorT kviCsSetSessionLastEvent(SaHpiSessionIdT SessionId,
                                          SaHpiUint32T LastEventRead) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetSessionLastEvent(SaHpiSessionIdT SessionId,
                                          SaHpiUint32T *LastEventRead) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsSetSessionEventSubscription(SaHpiSessionIdT SessionId,
                                                  SaHpiBoolT EventSubscribe,
                                                  SaHpiUint32T LastEventRead) KVI_NOEXCEPT;
KVI_API SaErrorT kviCsGetSessionEventSubscription(SaHpiSessionIdT SessionId,
                                                  SaHpiBoolT *EventSubscribe) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
