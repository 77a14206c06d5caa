/* The umbrella header is all a C plug-in or daemon needs. */
#include "KviDaemonCore.h"

int kviHeaderC11Probe(void);
int kviHeaderC11Probe(void)
{
    return (int)sizeof(KviCsRwLockT);
}
