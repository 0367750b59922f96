#include "standard_input.h"

#include <windows.h>

namespace orvane::logcat {

bool StandardInputIsGiven() {
  const HANDLE input = GetStdHandle(STD_INPUT_HANDLE);
  if (input == nullptr || input == INVALID_HANDLE_VALUE) return false;
  // The console and NUL are character devices.
  const DWORD type = GetFileType(input);
  return type == FILE_TYPE_PIPE || type == FILE_TYPE_DISK;
}

} // namespace orvane::logcat
