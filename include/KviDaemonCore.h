/* libKviDaemonCore: everything a daemon or a plug-in reaches of the library.
 * Include this header alone; it compiles as C11 and as C++20. */
#ifndef KVI_DAEMON_CORE_H
#define KVI_DAEMON_CORE_H

#include "SaHpi.h"
#include "kvi/KviExport.h"
#include "kvi/KviApiRedirector.h"
#include "kvi/KviConfig.h"
#include "kvi/KviDomain.h"
#include "kvi/KviEntitySchema.h"
#include "kvi/KviEvents.h"
#include "kvi/KviLogging.h"
#include "kvi/KviMaplInterface.h"
#include "kvi/KviMaplManager.h"
#include "kvi/KviMemory.h"
#include "kvi/KviNonVolatile.h"
#include "kvi/KviParmControl.h"
#include "kvi/KviProtocol.h"
#include "kvi/KviRdr.h"
#include "kvi/KviRpt.h"
#include "kvi/KviRwLock.h"
#include "kvi/KviSemaphore.h"
#include "kvi/KviSession.h"
#include "kvi/KviThread.h"
#include "kvi/KviTime.h"

#endif
