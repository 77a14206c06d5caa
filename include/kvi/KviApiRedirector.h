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

KVI_EXTERN_C_END

#endif
