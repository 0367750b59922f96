#include "file_identity.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace orvane::logcat {
namespace {

FileIdentity IdentityOf(const struct stat &status) {
  return {static_cast<std::uint64_t>(status.st_dev), static_cast<std::uint64_t>(status.st_ino)};
}

} // namespace

// The system calls themselves: glibc's stat and fstat have glibc 2.33's
// version, which older systems refuse; on 64-bit Linux the kernel fills this
// struct stat.
std::optional<FileIdentity> IdentityOfOpenFile(std::FILE *file) {
  struct stat status;
  if (::syscall(SYS_fstat, ::fileno(file), &status) != 0) return std::nullopt;
  return IdentityOf(status);
}

std::optional<FileIdentity> IdentityAtPath(const std::filesystem::path &path) {
  struct stat status;
  if (::syscall(SYS_newfstatat, AT_FDCWD, path.c_str(), &status, 0) != 0) return std::nullopt;
  return IdentityOf(status);
}

} // namespace orvane::logcat
