// Opening a log for reading without keeping a game from moving it away
// (rotating it) while it is read or followed, and only when it is a regular
// file: a FIFO would hang the reader and a device has no end.
#pragma once

#include <cstdint>
#include <cstdio>
#include <filesystem>

namespace orvane::logcat {

struct OpenedFile {
  std::FILE *file = nullptr;  // a binary stream, or null
  int error = 0;              // errno's reason when it could not be opened
  const char *kind = nullptr; // what the path names instead of a regular file ("a FIFO")
};

OpenedFile OpenForReading(const std::filesystem::path &path);

// Moves a stream opened by OpenForReading to `offset` bytes from its start.
bool SeekTo(std::FILE *file, std::uint64_t offset);

// True when a writer of the library is appending to the file right now: every
// append holds the log's shared lock until its handle closes, so the
// exclusive one cannot be had. False where the file system has no locks.
bool WriterIsAppending(std::FILE *file);

} // namespace orvane::logcat
