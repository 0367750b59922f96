#include "file_identity.h"

#include <io.h>
#include <windows.h>

namespace orvane::logcat {
namespace {

std::optional<FileIdentity> IdentityOf(HANDLE file) {
  BY_HANDLE_FILE_INFORMATION info;
  if (!GetFileInformationByHandle(file, &info)) return std::nullopt;
  const std::uint64_t index = static_cast<std::uint64_t>(info.nFileIndexHigh) << 32 | info.nFileIndexLow;
  return FileIdentity{info.dwVolumeSerialNumber, index};
}

} // namespace

std::optional<FileIdentity> IdentityOfOpenFile(std::FILE *file) {
  return IdentityOf(reinterpret_cast<HANDLE>(_get_osfhandle(_fileno(file))));
}

std::optional<FileIdentity> IdentityAtPath(const std::filesystem::path &path) {
  // Attributes only, sharing everything, so that no writer is kept out.
  const HANDLE file =
      CreateFileW(path.c_str(), FILE_READ_ATTRIBUTES, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE,
                  nullptr, OPEN_EXISTING, FILE_FLAG_BACKUP_SEMANTICS, nullptr);
  if (file == INVALID_HANDLE_VALUE) return std::nullopt;
  const std::optional<FileIdentity> identity = IdentityOf(file);
  CloseHandle(file);
  return identity;
}

} // namespace orvane::logcat
