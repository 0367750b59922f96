// POSIX implementation of the platform table.
#include "platform/platform.h"

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <ctime>
#include <fcntl.h>
#include <pthread.h>
#include <pwd.h>
#include <string_view>
#include <sys/file.h>
#include <sys/stat.h>
#include <sys/syscall.h>
#include <thread>
#include <unistd.h>

namespace orvane::platform {
namespace {

// stat, lstat and fstat as the system calls themselves: glibc's functions of those
// names have glibc 2.33's version, which older systems refuse to load. On
// 64-bit Linux the kernel fills the very struct stat of <sys/stat.h>.
static_assert(sizeof(long) == 8, "the kernel's struct stat is glibc's on 64-bit Linux only");
int StatPath(const char *path, struct stat &st) {
  return static_cast<int>(::syscall(SYS_newfstatat, AT_FDCWD, path, &st, 0));
}
int StatLink(const char *path, struct stat &st) {
  return static_cast<int>(::syscall(SYS_newfstatat, AT_FDCWD, path, &st, AT_SYMLINK_NOFOLLOW));
}
int StatOpenFile(int fd, struct stat &st) { return static_cast<int>(::syscall(SYS_fstat, fd, &st)); }

bool DirectoryExistsPosix(const char *path) {
  struct stat st;
  return StatPath(path, st) == 0 && S_ISDIR(st.st_mode);
}

// Owner-only whatever the umask: another local user must not be able to
// plant links or FIFOs where the logs go, or read logs whose key follows from
// their names. The mode is set after mkdir, which the umask narrows (0177
// would leave a folder nothing can be made in); a folder of ours that an
// earlier run left so is mended, a link at its place is left alone.
bool MakeDirectoryPosix(const char *path) {
  if (::mkdir(path, 0700) != 0 && errno != EEXIST) return false;
  struct stat st;
  if (StatLink(path, st) != 0 || !S_ISDIR(st.st_mode)) return false;
  return (st.st_mode & 07777) == 0700 || ::chmod(path, 0700) == 0;
}

bool MakePrivateDirectoriesPosix(const char *path) {
  const std::string_view whole(path);
  // Create each missing level from the top, so that a missing parent of the
  // data directory gets the same owner-only mode; levels that exist are the
  // account's own and keep theirs.
  for (std::size_t end = 0; end != std::string_view::npos;) {
    end = whole.find('/', end + 1);
    const std::string level(whole.substr(0, end));
    if (::mkdir(level.c_str(), 0700) == 0) {
      ::chmod(level.c_str(), 0700);
    } else if (errno != EEXIST) {
      return false;
    }
  }
  return DirectoryExistsPosix(path);
}

LockResult TryLockFilePosix(FileHandle file, LockMode mode) {
  // flock, not fcntl: an flock belongs to the open file description, so two
  // opens of one log in this process exclude each other as two processes do,
  // and closing another descriptor of the file does not drop it. Linux
  // converts a held lock by dropping it first, so a failed conversion holds
  // none and two writers converting at once cannot wait for each other.
  const int operation = mode == LockMode::kShared ? LOCK_SH : LOCK_EX;
  if (::flock(static_cast<int>(file), operation | LOCK_NB) == 0) return LockResult::kLocked;
  return errno == EWOULDBLOCK || errno == EINTR ? LockResult::kBusy : LockResult::kFailed;
}

FileHandle OpenLogPosix(const char *path, LockResult &lock, std::int64_t &size) {
  // O_NOFOLLOW: a link at the log path would let the library write anywhere
  // the game may. O_NONBLOCK: opening a FIFO must not hang the game.
  int fd;
  do {
    fd = ::open(path, O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, 0600);
  } while (fd < 0 && errno == EINTR);
  if (fd < 0) return kNoFile;
  lock = TryLockFilePosix(fd, LockMode::kShared);
  // The size comes from seeking to the end, which costs a fraction of fstat
  // and refuses a FIFO or a terminal by itself. Only what reads as empty (a
  // new log, or a device such as /dev/null) has its type examined; a block
  // device, which only root can place, would pass.
  const off_t end = ::lseek(fd, 0, SEEK_END);
  if (end < 0 && errno == ESPIPE) {
    ::close(fd);
    return kNoFile;
  }
  size = end < 0 ? -1 : end;
  if (end != 0) return fd;
  struct stat st;
  if (StatOpenFile(fd, st) != 0) {
    size = -1;
  } else if (!S_ISREG(st.st_mode)) {
    ::close(fd);
    return kNoFile;
  } else if ((st.st_mode & 07777) != 0600) {
    // A new log gets the mode the umask may have narrowed (0400 under 0277
    // would refuse the next open).
    ::fchmod(fd, 0600);
  }
  return fd;
}

std::int64_t FileSizePosix(FileHandle file) {
  // The end of an append-only file is where every write lands anyway.
  const off_t end = ::lseek(static_cast<int>(file), 0, SEEK_END);
  return end < 0 ? -1 : end;
}

bool AppendPosix(FileHandle file, const void *data, std::size_t size) {
  // One write call: with O_APPEND the kernel places the whole line at the end
  // atomically, so lines of concurrent writers never interleave. A short
  // write (disk full) is a failure; retrying would split the line.
  ssize_t written;
  do {
    written = ::write(static_cast<int>(file), data, size);
  } while (written < 0 && errno == EINTR);
  return written >= 0 && static_cast<std::size_t>(written) == size;
}

bool TruncateFilePosix(FileHandle file, std::int64_t size) {
  int result;
  do {
    result = ::ftruncate(static_cast<int>(file), static_cast<off_t>(size));
  } while (result != 0 && errno == EINTR);
  return result == 0;
}

bool CloseFilePosix(FileHandle file) {
  // On Linux the descriptor is released even when close reports EINTR, so it
  // is never retried.
  return ::close(static_cast<int>(file)) == 0;
}

void UnlockFilePosix(FileHandle file) { ::flock(static_cast<int>(file), LOCK_UN); }

std::int64_t NowSecondsPosix() { return static_cast<std::int64_t>(::time(nullptr)); }

std::int64_t SteadyMillisecondsPosix() {
  const auto now = std::chrono::steady_clock::now().time_since_epoch();
  return std::chrono::duration_cast<std::chrono::milliseconds>(now).count();
}

void SleepMillisecondsPosix(int milliseconds) {
  std::this_thread::sleep_for(std::chrono::milliseconds(milliseconds));
}

// Closes a descriptor on every path out, an allocation failure included.
struct Descriptor {
  int fd;
  ~Descriptor() {
    if (fd >= 0) ::close(fd);
  }
};

bool ArgumentListPosix(ArgumentList &args) {
  const Descriptor cmdline{::open("/proc/self/cmdline", O_RDONLY | O_CLOEXEC)};
  if (cmdline.fd < 0) return false;
  std::string bytes;
  char chunk[4096];
  for (;;) {
    const ssize_t n = ::read(cmdline.fd, chunk, sizeof chunk);
    if (n < 0 && errno == EINTR) continue;
    if (n < 0) return false;
    if (n == 0) break;
    bytes.append(chunk, static_cast<std::size_t>(n));
  }
  // Every argument ends in a zero byte (the last may not); each byte becomes
  // one unit so that narrowing gives the argument's bytes back unchanged.
  for (std::size_t start = 0; start < bytes.size();) {
    std::size_t end = bytes.find('\0', start);
    if (end == std::string::npos) end = bytes.size();
    std::u16string &arg = args.emplace_back(end - start, u'\0');
    for (std::size_t i = start; i < end; ++i)
      arg[i - start] = static_cast<char16_t>(static_cast<unsigned char>(bytes[i]));
    start = end + 1;
  }
  return true;
}

std::string HomeDirectory() {
  if (const char *home = std::getenv("HOME"); home && home[0] == '/') return home;
  long size = ::sysconf(_SC_GETPW_R_SIZE_MAX);
  std::vector<char> buffer(size > 0 ? static_cast<std::size_t>(size) : 16384);
  struct passwd entry;
  struct passwd *found = nullptr;
  if (::getpwuid_r(::getuid(), &entry, buffer.data(), buffer.size(), &found) == 0 && found && found->pw_dir &&
      found->pw_dir[0] == '/')
    return found->pw_dir;
  return {};
}

const Calls kPosixCalls = {
    .directory_exists = DirectoryExistsPosix,
    .make_directory = MakeDirectoryPosix,
    .make_private_directories = MakePrivateDirectoriesPosix,
    .open_log = OpenLogPosix,
    .file_size = FileSizePosix,
    .append = AppendPosix,
    .truncate_file = TruncateFilePosix,
    .close_file = CloseFilePosix,
    .try_lock_file = TryLockFilePosix,
    .unlock_file = UnlockFilePosix,
    .now_seconds = NowSecondsPosix,
    .steady_milliseconds = SteadyMillisecondsPosix,
    .sleep_milliseconds = SleepMillisecondsPosix,
    .argument_list = ArgumentListPosix,
};

Calls g_calls = kPosixCalls;

} // namespace

Calls &calls() { return g_calls; }
const Calls &native_calls() { return kPosixCalls; }

StorageLocation default_storage_location() {
  // A per-user location: it needs no root rights, and no other user can
  // prepare it the way a shared /tmp or /var path can be.
  StorageLocation where;
  if (const char *xdg = std::getenv("XDG_DATA_HOME"); xdg && xdg[0] == '/') {
    where.base = xdg;
  } else {
    std::string home = HomeDirectory();
    if (home.empty()) return where; // nowhere to store: every open fails
    where.base = home + "/.local/share";
  }
  while (where.base.size() > 1 && where.base.back() == '/') where.base.pop_back();
  where.root = where.base + "/Orvane/";
  where.logs = where.root + "Logs/";
  return where;
}

std::string_view line_break() { return "\n"; }

int DisableCancellation() noexcept {
  int previous = PTHREAD_CANCEL_ENABLE;
  ::pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &previous);
  return previous;
}

void RestoreCancellation(int previous) { ::pthread_setcancelstate(previous, nullptr); }

void RunInForkedChildren(void (*reset)()) { ::pthread_atfork(nullptr, nullptr, reset); }

} // namespace orvane::platform
