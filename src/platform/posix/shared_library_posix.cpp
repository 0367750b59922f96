// dlopen and dlsym as glibc before 2.34 exported them, from libdl.so.2 (which
// the build names as needed): glibc 2.34 moved both into libc.so.6 under a new
// version, which an older loader refuses, and keeps the old version there too.
#include "platform/shared_library.h"

#include <dlfcn.h>

__asm__(".symver dlopen,dlopen@GLIBC_2.2.5");
__asm__(".symver dlsym,dlsym@GLIBC_2.2.5");

namespace orvane::platform {

void *OpenSystemLibrary(std::span<const char *const> names) {
  for (const char *name : names) {
    // RTLD_LOCAL: its symbols stay out of the game's namespace. Never closed,
    // so no state of it is torn down under a game's exit handlers.
    if (void *library = ::dlopen(name, RTLD_NOW | RTLD_LOCAL)) return library;
  }
  return nullptr;
}

void *FindSymbol(void *library, const char *name) { return ::dlsym(library, name); }

} // namespace orvane::platform
