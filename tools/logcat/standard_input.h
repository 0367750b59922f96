// Whether the user handed the reader something on standard input.
#pragma once

namespace orvane::logcat {

// True when standard input is a pipe or a file; false for a terminal, the
// null device, or no standard input at all. Only then does a run without
// arguments read standard input instead of the Logs folder.
bool StandardInputIsGiven();

} // namespace orvane::logcat
