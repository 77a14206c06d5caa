// Test seam of the accounting allocator: not exported from the shared library.
#pragma once

#include "SaHpi.h"

// Makes the Nth allocation from now (1: the very next one) fail as if the
// system were out of memory; reallocations that grow a block count as
// allocations. 0 switches the hook off. Later allocations succeed again.
void kviCsMemoryFailNthAllocation(SaHpiInt32T Nth) noexcept;
