// What the dynamic loader runs when the library comes and goes.
#pragma once

void kviDsLibraryLoaded() noexcept;
void kviDsLibraryUnloaded() noexcept;
