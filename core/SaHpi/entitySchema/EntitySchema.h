// Entity schema internals for the tests; not exported.
#pragma once

#include "kvi/KviEntitySchema.h"

// Test seam: forgets the cached identifier, so the next call reads the
// configuration again as the first call of a fresh process would.
void kviCsEntitySchemaForget() noexcept;
