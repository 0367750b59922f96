#include "standard_input.h"

#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace orvane::logcat {

bool StandardInputIsGiven() {
  struct stat status;
  // The system call itself: glibc's fstat has glibc 2.33's version, which
  // older systems refuse; on 64-bit Linux the kernel fills this struct stat.
  if (::syscall(SYS_fstat, STDIN_FILENO, &status) != 0) return false;
  return S_ISFIFO(status.st_mode) || S_ISREG(status.st_mode) || S_ISSOCK(status.st_mode);
}

} // namespace orvane::logcat
