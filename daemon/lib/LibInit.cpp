// The library's load and unload hooks. They only mark the moments in the log:
// everything the library needs is set up by the daemon's explicit calls, in
// an order the loader could not know. Before the daemon opens its log the
// lines go nowhere.
#include "daemon/lib/LibInit.h"

#include "core/utils/KviTrace.h"

__attribute__((constructor)) void kviDsLibraryLoaded() noexcept
{
    KVI_TRACE("");
}

__attribute__((destructor)) void kviDsLibraryUnloaded() noexcept
{
    KVI_TRACE("");
}
