#include "open_for_reading.h"

#include "platform/platform.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <unistd.h>

namespace orvane::logcat {
namespace {

const char *KindOf(mode_t mode) {
  if (S_ISFIFO(mode)) return "a FIFO";
  if (S_ISCHR(mode)) return "a character device";
  if (S_ISBLK(mode)) return "a block device";
  if (S_ISSOCK(mode)) return "a socket";
  if (S_ISDIR(mode)) return "a folder";
  return S_ISREG(mode) ? nullptr : "not a file";
}

} // namespace

// The system calls themselves for the status: glibc's stat and fstat have
// glibc 2.33's version, which older systems refuse. The type is looked at
// before the open, since opening a device may act on it, and after, since
// the path may name something else by then: O_NONBLOCK keeps a FIFO put
// there meanwhile from hanging the open, and changes nothing for a file.
// An open file never keeps its name from being moved or removed here.
OpenedFile OpenForReading(const std::filesystem::path &path) {
  struct stat status;
  if (::syscall(SYS_newfstatat, AT_FDCWD, path.c_str(), &status, 0) != 0) return {nullptr, errno};
  if (const char *kind = KindOf(status.st_mode)) return {nullptr, 0, kind};
  const int descriptor = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
  if (descriptor < 0) return {nullptr, errno};
  const char *kind = ::syscall(SYS_fstat, descriptor, &status) == 0 ? KindOf(status.st_mode) : nullptr;
  std::FILE *file = kind == nullptr ? ::fdopen(descriptor, "rb") : nullptr;
  const int error = errno;
  if (file == nullptr) ::close(descriptor);
  return {file, file == nullptr && kind == nullptr ? error : 0, kind};
}

bool SeekTo(std::FILE *file, std::uint64_t offset) {
  return ::fseeko(file, static_cast<off_t>(offset), SEEK_SET) == 0;
}

bool WriterIsAppending(std::FILE *file) {
  const platform::Calls &os = platform::native_calls();
  const platform::FileHandle handle = ::fileno(file);
  const platform::LockResult lock = os.try_lock_file(handle, platform::LockMode::kExclusive);
  if (lock == platform::LockResult::kLocked) os.unlock_file(handle);
  return lock == platform::LockResult::kBusy;
}

} // namespace orvane::logcat
