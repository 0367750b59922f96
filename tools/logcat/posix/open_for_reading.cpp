#include "open_for_reading.h"

namespace orvane::logcat {

// An open file never keeps its name from being moved or removed here.
std::FILE *OpenForReading(const std::filesystem::path &path) { return std::fopen(path.c_str(), "rb"); }

} // namespace orvane::logcat
