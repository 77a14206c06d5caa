// The umbrella header compiles as C++20 and declares C linkage.
#include "KviDaemonCore.h"

static_assert(sizeof(KviCsLinkedListNodeT) == 4 * sizeof(void *));
int kviHeaderCxx20Probe() { return static_cast<int>(sizeof(KviCsSemaphore)); }
