#include "file_identity.h"

#include <sys/stat.h>

namespace orvane::logcat {
namespace {

FileIdentity IdentityOf(const struct stat &status) {
  return {static_cast<std::uint64_t>(status.st_dev), static_cast<std::uint64_t>(status.st_ino)};
}

} // namespace

std::optional<FileIdentity> IdentityOfOpenFile(std::FILE *file) {
  struct stat status;
  if (::fstat(::fileno(file), &status) != 0) return std::nullopt;
  return IdentityOf(status);
}

std::optional<FileIdentity> IdentityAtPath(const std::filesystem::path &path) {
  struct stat status;
  if (::stat(path.c_str(), &status) != 0) return std::nullopt;
  return IdentityOf(status);
}

} // namespace orvane::logcat
