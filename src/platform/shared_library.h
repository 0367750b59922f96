// Libraries of the player's system that the library loads when it first
// needs them, instead of naming them to the loader: a missing one then fails
// that use, not the loading of the whole library.
#pragma once

#include <span>

namespace orvane::platform {

// The first of `names` that the system's loader finds, loaded for the rest of
// the process; null when none is found.
void *OpenSystemLibrary(std::span<const char *const> names);
// The address of `name` in a library from OpenSystemLibrary, or null.
void *FindSymbol(void *library, const char *name);

} // namespace orvane::platform
