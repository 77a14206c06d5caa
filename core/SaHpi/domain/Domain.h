// Domain settings that only the library itself changes; not exported.
#pragma once

#include "kvi/KviDomain.h"

// A timeout a client may give: SAHPI_TIMEOUT_BLOCK or not negative.
inline bool kviCsTimeoutIsValid(SaHpiTimeoutT Timeout) noexcept
{
    return Timeout >= 0 || Timeout == SAHPI_TIMEOUT_BLOCK;
}

// Sets the domain's auto-insert timeout. SA_ERR_HPI_INVALID_DOMAIN for any
// domain but the default one, SA_ERR_HPI_INVALID_PARAMS for a timeout that
// kviCsTimeoutIsValid refuses. Saving it is the caller's business.
SaErrorT kviCsAutoInsertTimeoutSet(SaHpiDomainIdT DomainId, SaHpiTimeoutT Timeout) noexcept;
