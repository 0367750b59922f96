// Opening a log for reading without keeping a game from moving it away
// (rotating it) while it is read or followed.
#pragma once

#include <cstdio>
#include <filesystem>

namespace orvane::logcat {

// A binary stream on the file at `path`, or null with errno telling why.
std::FILE *OpenForReading(const std::filesystem::path &path);

} // namespace orvane::logcat
