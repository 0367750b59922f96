// What lets orvane-logcat, built with a current glibc and GCC, start on
// glibc 2.31 with GCC 10's libstdc++ (Debian 11, Ubuntu 20.04), where QA
// machines and game runtimes still are. Each definition here replaces a
// reference to a version those systems lack; the build links them into the
// program only (tests/check_glibc_baseline.cmake keeps the result in check).
#include <cstddef>
#include <new>

extern "C" {

using Main = int (*)(int, char **, char **);
using Constructor = void (*)(int, char **, char **);

// The program's constructor table, bounded by the linker, and its _init.
extern Constructor __init_array_start[] __attribute__((visibility("hidden")));
extern Constructor __init_array_end[] __attribute__((visibility("hidden")));
void _init();

// glibc 2.34 gave __libc_start_main a new version and made the program's
// start code pass no constructor runner, leaving that to libc. Every glibc
// still has the 2.2.5 version, which runs the runner it is given: this one
// does what the older start code's did (the loader runs the preinit table).
int StartMain225(Main main, int argc, char **argv, Constructor init, void (*fini)(), void (*rtld_fini)(),
                 void *stack_end);
__asm__(".symver StartMain225,__libc_start_main@GLIBC_2.2.5");

static void RunConstructors(int argc, char **argv, char **envp) {
  _init();
  for (Constructor *c = __init_array_start; c != __init_array_end; ++c) (*c)(argc, argv, envp);
}

// The start code's call arrives here (the link wraps __libc_start_main).
int __wrap___libc_start_main(Main main, int argc, char **argv, Constructor, void (*)(), void (*rtld_fini)(),
                             void *stack_end) {
  return StartMain225(main, argc, argv, RunConstructors, nullptr, rtld_fini, stack_end);
}

// Read by libstdc++'s inline reference counting (glibc 2.32). Zero: the
// program may run threads, so the counts always stay atomic.
char __libc_single_threaded = 0;

} // extern "C"

// Called by allocators' inline size checks; libstdc++ has it from GCC 11 on.
namespace std {
[[noreturn]] void __throw_bad_array_new_length() { throw bad_array_new_length(); }
} // namespace std
