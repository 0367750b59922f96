#include "standard_input.h"

#include <sys/stat.h>
#include <unistd.h>

namespace orvane::logcat {

bool StandardInputIsGiven() {
  struct stat status;
  if (::fstat(STDIN_FILENO, &status) != 0) return false;
  return S_ISFIFO(status.st_mode) || S_ISREG(status.st_mode) || S_ISSOCK(status.st_mode);
}

} // namespace orvane::logcat
