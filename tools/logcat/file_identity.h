// Which file a path names now, and which one an open stream reads, so that a
// follower notices a log moved away and started again at its path.
#pragma once

#include <cstdint>
#include <cstdio>
#include <filesystem>
#include <optional>

namespace orvane::logcat {

// Device and inode on POSIX; volume serial number and file index on Windows.
struct FileIdentity {
  std::uint64_t volume = 0;
  std::uint64_t index = 0;
  bool operator==(const FileIdentity &) const = default;
};

// Nullopt when it cannot be taken, for a path also when nothing is there.
std::optional<FileIdentity> IdentityOfOpenFile(std::FILE *file);
std::optional<FileIdentity> IdentityAtPath(const std::filesystem::path &path);

} // namespace orvane::logcat
