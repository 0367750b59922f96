// The operating-system calls the library needs, behind one table.
//
// Each platform (posix/, windows/) fills the table with its own
// implementation; the logic above calls only through it and never asks which
// platform it runs on. Policy (how long to wait for a lock, when to retry, how
// large a line may be) is decided above the table, once; the entries only do.
// Tests replace single entries to inject failures, the way SQLite swaps its
// system calls.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace orvane::platform {

// An open log file; kNoFile when an open failed.
using FileHandle = std::intptr_t;
inline constexpr FileHandle kNoFile = -1;

// The process arguments in command-line order, argument 0 included, each as
// 16-bit units.
using ArgumentList = std::vector<std::u16string>;

enum class LockResult { kLocked, kBusy, kFailed };
enum class LockMode { kShared, kExclusive };

struct Calls {
  // True exactly when `path` names an existing directory, with or without a
  // trailing separator.
  bool (*directory_exists)(const char *path);
  // Creates one directory level, or finds one there; either way leaves it
  // for this user only where the platform has per-file permissions, whatever
  // the umask. True when the directory is there.
  bool (*make_directory)(const char *path);
  // Creates `path` and its missing parents, readable by the owner only.
  bool (*make_private_directories)(const char *path);

  // Opens the regular file `path` for appending, creating it (owner-only)
  // when missing, with no sharing restriction toward other handles or
  // processes; then tries the shared lock on it (`lock`, as try_lock_file
  // gives it) and sets `size` to its size (-1 when it cannot be taken), so
  // that a size measured under the lock costs no call of its own. Refuses,
  // without blocking, anything that is not a regular file: a link at `path`,
  // a FIFO, a device.
  FileHandle (*open_log)(const char *path, LockResult &lock, std::int64_t &size);
  // Size of the open file in bytes, -1 when it cannot be taken.
  std::int64_t (*file_size)(FileHandle file);
  // One write at the current end of the file; true only when all bytes went.
  bool (*append)(FileHandle file, const void *data, std::size_t size);
  // Cuts the file back to `size` bytes.
  bool (*truncate_file)(FileHandle file, std::int64_t size);
  // True when everything buffered reached the file. Gives back the lock the
  // handle holds (where another process shares the handle after a fork, it
  // keeps the lock until it closes its copy; unlock_file does not wait).
  bool (*close_file)(FileHandle file);
  // Advisory lock between open files, also of one process; never waits.
  // Shared locks exclude only an exclusive one. Asking for the other mode
  // converts the lock held; a conversion that fails leaves none held.
  LockResult (*try_lock_file)(FileHandle file, LockMode mode);
  void (*unlock_file)(FileHandle file);

  // Whole seconds since 1970-01-01 00:00:00 UTC.
  std::int64_t (*now_seconds)();
  // A clock that only moves forward, for deadlines.
  std::int64_t (*steady_milliseconds)();
  void (*sleep_milliseconds)(int milliseconds);
  // The process argument list, read afresh. False when it cannot be had.
  bool (*argument_list)(ArgumentList &args);
};

// The live table. Tests may overwrite entries and restore them afterwards.
Calls &calls();
// The platform's own implementation, for restoring.
const Calls &native_calls();

// Where the library keeps its files on this platform.
struct StorageLocation {
  std::string base; // created with its parents when missing; empty: taken to exist
  std::string root; // ends in the separator
  std::string logs; // directly inside root, ends in the separator
};
// Reads the environment (and on POSIX possibly the account database), so it
// runs on first use, never at load.
StorageLocation default_storage_location();

// The bytes that separate two lines of a log file.
std::string_view line_break();

// Keeps the calling thread from being cancelled while it runs library code
// (an unwinding cancellation cannot pass the library's noexcept frames), and
// returns the caller's setting for RestoreCancellation.
int DisableCancellation() noexcept;
// Gives the caller's setting back. A cancellation that arrived meanwhile acts
// right here when the caller asked for asynchronous cancellation, unwinding
// through the callers: so this is called from no noexcept frame, a
// destructor included.
void RestoreCancellation(int previous);

// Has `reset` run in the child of every later fork, on the child's one
// thread, where the platform forks. Called on first use, never at load.
void RunInForkedChildren(void (*reset)());

} // namespace orvane::platform
