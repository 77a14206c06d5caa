// Switches the daemon into the background.
#include "kvi/KviTime.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <unistd.h>

#include "core/utils/KviTrace.h"

extern "C" KVI_EXPORT SaErrorT kviCsDaemonize(void) noexcept
{
    KVI_TRACE("");
    if (daemon(0, 0) != 0) {
        fprintf(stderr, "call to daemon failed.  error is: %s\n", strerror(errno));
        exit(1);
    }
    return SA_OK;
}
