/* The entity schema that the system's entity paths follow, taken from the
 * configuration key "KviEntitySchemaId" ("CPCI", "ATCA" or "OEM" and one
 * hexadecimal-digit character) as four ASCII letters packed high byte first. */
#ifndef KVI_ENTITY_SCHEMA_H
#define KVI_ENTITY_SCHEMA_H

#include "SaHpi.h"
#include "kvi/KviExport.h"

KVI_EXTERN_C_BEGIN

/* Reads the setting on the first successful call and answers from a cache
 * afterwards; a change of the key later has no effect. */
KVI_API SaErrorT kviCsEntitySchemaGet(SaHpiUint32T *Value) KVI_NOEXCEPT;

KVI_EXTERN_C_END

#endif
