/* Posting events. Plug-ins report what happens to their resources by putting
 * HPI events into the event queue of the domain; every subscribed session
 * then reads them in order.
 *
 * The queue is a ring of fixed size: a writer never waits for slow readers
 * and overwrites the oldest event, and a reader that fell behind is told so.
 * Safe from any thread, including a plug-in's own threads and its slots. */
#ifndef KVI_EVENTS_H
#define KVI_EVENTS_H

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

/* Appends NumberOfEvents events, copied, to the queue of DomainId (only the
 * default domain exists). An event is numbered when it is put; EventNumber,
 * when not NULL, receives the number of the first. ActiveAlarm is for the
 * library's own use: plug-ins pass SAHPI_FALSE and 0. Fails with
 * SA_ERR_HPI_INVALID_REQUEST or SA_ERR_HPI_ERROR while the library is not
 * initialized. */
KVI_API SaErrorT kviCsPutEvent(SaHpiDomainIdT DomainId, SaHpiEventT *Events,
                               SaHpiInt32T NumberOfEvents, SaHpiBoolT ActiveAlarm,
                               SaHpiSessionIdT ActiveAlarmSessionId,
                               SaHpiUint32T *EventNumber) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
