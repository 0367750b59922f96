#include "open_for_reading.h"

#include "platform/platform.h"

#include <cerrno>
#include <fcntl.h>
#include <io.h>
#include <windows.h>

namespace orvane::logcat {
namespace {

int ErrnoOf(DWORD error) {
  if (error == ERROR_FILE_NOT_FOUND || error == ERROR_PATH_NOT_FOUND) return ENOENT;
  return error == ERROR_CANT_RESOLVE_FILENAME ? ELOOP : EACCES;
}

const char *KindOf(HANDLE file) {
  switch (GetFileType(file)) {
  case FILE_TYPE_DISK: return nullptr;
  case FILE_TYPE_CHAR: return "a character device";
  case FILE_TYPE_PIPE: return "a pipe";
  default: return "not a file";
  }
}

} // namespace

OpenedFile OpenForReading(const std::filesystem::path &path) {
  // The C runtime's fopen shares reading and writing but not deletion, and a
  // file open without that cannot be renamed: the game's rotation would fail.
  const HANDLE file =
      CreateFileW(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr,
                  OPEN_EXISTING, FILE_ATTRIBUTE_NORMAL, nullptr);
  if (file == INVALID_HANDLE_VALUE) return {nullptr, ErrnoOf(GetLastError())};
  if (const char *kind = KindOf(file)) {
    CloseHandle(file);
    return {nullptr, 0, kind};
  }
  const int descriptor = _open_osfhandle(reinterpret_cast<intptr_t>(file), _O_RDONLY | _O_BINARY);
  if (descriptor == -1) {
    CloseHandle(file);
    return {nullptr, EMFILE};
  }
  std::FILE *stream = _fdopen(descriptor, "rb");
  if (stream == nullptr) _close(descriptor);
  return {stream, stream == nullptr ? EMFILE : 0};
}

bool SeekTo(std::FILE *file, std::uint64_t offset) {
  return _fseeki64(file, static_cast<__int64>(offset), SEEK_SET) == 0;
}

bool WriterIsAppending(std::FILE *file) {
  const platform::Calls &os = platform::native_calls();
  const auto handle = static_cast<platform::FileHandle>(_get_osfhandle(_fileno(file)));
  const platform::LockResult lock = os.try_lock_file(handle, platform::LockMode::kExclusive);
  if (lock == platform::LockResult::kLocked) os.unlock_file(handle);
  return lock == platform::LockResult::kBusy;
}

} // namespace orvane::logcat
