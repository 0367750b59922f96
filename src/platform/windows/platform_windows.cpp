// Windows implementation of the platform table.
#include "platform/platform.h"

#define WIN32_LEAN_AND_MEAN
#ifndef NOMINMAX // libstdc++ on mingw defines it already
#define NOMINMAX
#endif
#include <windows.h>

#include <shellapi.h>

#include <cerrno>
#include <direct.h>
#include <memory>
#include <time.h>

namespace orvane::platform {
namespace {

HANDLE AsHandle(FileHandle file) { return reinterpret_cast<HANDLE>(file); }

bool DirectoryExistsWindows(const char *path) {
  // Asked of the file system directly, not through the C runtime: msvcrt's
  // _stat fails for a directory path that ends in a backslash, which is the
  // form every storage directory has.
  const DWORD attributes = ::GetFileAttributesA(path);
  return attributes != INVALID_FILE_ATTRIBUTES && (attributes & FILE_ATTRIBUTE_DIRECTORY) != 0;
}

bool MakeDirectoryWindows(const char *path) {
  return ::_mkdir(path) == 0 || (errno == EEXIST && DirectoryExistsWindows(path));
}

bool IsSeparator(char c) { return c == '\\' || c == '/'; }

bool MakePrivateDirectoriesWindows(const char *path) {
  // The real storage has no base (the drive root is taken to exist); a test
  // base may still lack levels. New directories inherit the parent's access
  // rules, which is what owner-only means for a per-user location here.
  const std::string full(path);
  for (std::size_t i = 1; i <= full.size(); ++i) {
    if (i != full.size() && !IsSeparator(full[i])) continue;
    const std::string level = full.substr(0, i);
    if (level.back() == ':' || IsSeparator(level.back())) continue; // "C:" or a doubled separator
    if (::_mkdir(level.c_str()) != 0 && errno != EEXIST && !DirectoryExistsWindows(level.c_str()))
      return false;
  }
  return DirectoryExistsWindows(path);
}

LockResult TryLockFileWindows(FileHandle file, LockMode mode);
bool CloseFileWindows(FileHandle file);

FileHandle OpenLogWindows(const char *path, LockResult &lock, std::int64_t &size) {
  // Append data without write data: the system places every WriteFile at the
  // end of the file at that moment, so lines of concurrent writers never
  // overwrite each other. Read data is there for the byte-range lock, read
  // attributes for the size. Every sharing mode is allowed, so that other
  // handles and processes (a second game, a reader) may open the file
  // meanwhile. A reparse point (a link) at the path is opened as itself, not
  // followed, and then refused below; the folders keep their default access
  // rules, since several users of one machine share C:\Orvane\.
  const HANDLE file =
      ::CreateFileA(path, FILE_READ_DATA | FILE_APPEND_DATA | FILE_READ_ATTRIBUTES | SYNCHRONIZE,
                    FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr, OPEN_ALWAYS,
                    FILE_ATTRIBUTE_NORMAL | FILE_FLAG_OPEN_REPARSE_POINT, nullptr);
  if (file == INVALID_HANDLE_VALUE) return kNoFile;
  BY_HANDLE_FILE_INFORMATION info;
  if (::GetFileType(file) != FILE_TYPE_DISK) {
    ::CloseHandle(file);
    return kNoFile;
  }
  lock = TryLockFileWindows(reinterpret_cast<FileHandle>(file), LockMode::kShared);
  if (!::GetFileInformationByHandle(file, &info)) {
    size = -1;
  } else if ((info.dwFileAttributes & (FILE_ATTRIBUTE_REPARSE_POINT | FILE_ATTRIBUTE_DIRECTORY)) != 0) {
    CloseFileWindows(reinterpret_cast<FileHandle>(file));
    return kNoFile;
  } else {
    size =
        static_cast<std::int64_t>((static_cast<std::uint64_t>(info.nFileSizeHigh) << 32) | info.nFileSizeLow);
  }
  return reinterpret_cast<FileHandle>(file);
}

std::int64_t FileSizeWindows(FileHandle file) {
  LARGE_INTEGER size;
  if (!::GetFileSizeEx(AsHandle(file), &size)) return -1;
  return size.QuadPart;
}

// Byte-range locks on Windows are mandatory: a write into a locked range
// fails. The locks therefore cover bytes far beyond any real file size, where
// no append ever lands; they only serve as tokens between handles.
constexpr DWORD kLockOffsetHigh = 0x40000000; // byte 2^62: the log's lock
constexpr DWORD kAppendLockOffset = 1;       // the byte after it: one append

OVERLAPPED LockRange(DWORD offset = 0) {
  OVERLAPPED where{};
  where.Offset = offset;
  where.OffsetHigh = kLockOffsetHigh;
  return where;
}

// Windows appends through an append-only handle in one step. Wine (and so
// Proton) seeks to the end and then writes, so two handles appending at once
// may write over each other, across processes as within one: there every
// append takes the append byte's lock first. Wine is known by the function
// its ntdll exports under its name.
bool AppendsNeedTheirLock() {
  static const bool wine = [] {
    const HMODULE ntdll = ::GetModuleHandleA("ntdll.dll");
    return ntdll != nullptr && ::GetProcAddress(ntdll, "wine_get_version") != nullptr;
  }();
  return wine;
}

// Waits for the append byte, at most about a second: another writer holds it
// for one write only. Locks of a handle that a process closes or loses when
// it ends are given back by the system.
bool LockForAppend(HANDLE file) {
  const ULONGLONG deadline = ::GetTickCount64() + 1000;
  for (int round = 0;; ++round) {
    OVERLAPPED where = LockRange(kAppendLockOffset);
    if (::LockFileEx(file, LOCKFILE_EXCLUSIVE_LOCK | LOCKFILE_FAIL_IMMEDIATELY, 0, 1, 0, &where)) return true;
    if (::GetLastError() != ERROR_LOCK_VIOLATION || ::GetTickCount64() >= deadline) return false;
    ::Sleep(round < 50 ? 0 : 1);
  }
}

bool AppendWindows(FileHandle file, const void *data, std::size_t size) {
  // One write call, as on POSIX: a short write is a failure, since retrying
  // would split the line.
  if (size > MAXDWORD) return false;
  const bool serialised = AppendsNeedTheirLock();
  if (serialised && !LockForAppend(AsHandle(file))) return false;
  DWORD written = 0;
  const bool whole =
      ::WriteFile(AsHandle(file), data, static_cast<DWORD>(size), &written, nullptr) && written == size;
  if (serialised) {
    OVERLAPPED where = LockRange(kAppendLockOffset);
    ::UnlockFileEx(AsHandle(file), 0, 1, 0, &where);
  }
  return whole;
}

bool TruncateFileWindows(FileHandle file, std::int64_t size) {
  // The log handle may only append; cutting back needs write access, which a
  // second handle to the same file gets without opening the path again.
  const HANDLE writer =
      ::ReOpenFile(AsHandle(file), GENERIC_WRITE, FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, 0);
  if (writer == INVALID_HANDLE_VALUE) return false;
  LARGE_INTEGER at;
  at.QuadPart = size;
  const bool cut = ::SetFilePointerEx(writer, at, nullptr, FILE_BEGIN) && ::SetEndOfFile(writer);
  ::CloseHandle(writer);
  return cut;
}

void UnlockFileWindows(FileHandle file) {
  OVERLAPPED where = LockRange();
  ::UnlockFileEx(AsHandle(file), 0, 1, 0, &where);
}

LockResult TryLockFileWindows(FileHandle file, LockMode mode) {
  // A lock belongs to its handle, so two handles of one process exclude each
  // other as two processes do. Windows converts no lock, and its own shared
  // lock would refuse the exclusive one: it is given back first, as Linux
  // does, so a failed conversion holds none.
  if (mode == LockMode::kExclusive) UnlockFileWindows(file);
  const DWORD flags =
      LOCKFILE_FAIL_IMMEDIATELY | (mode == LockMode::kExclusive ? LOCKFILE_EXCLUSIVE_LOCK : 0);
  OVERLAPPED where = LockRange();
  if (::LockFileEx(AsHandle(file), flags, 0, 1, 0, &where)) return LockResult::kLocked;
  return ::GetLastError() == ERROR_LOCK_VIOLATION ? LockResult::kBusy : LockResult::kFailed;
}

bool CloseFileWindows(FileHandle file) {
  // Windows gives the locks of a closed handle back only when it gets to it;
  // a starting writer must not wait for that. Unlocking a handle that holds
  // no lock merely fails.
  UnlockFileWindows(file);
  return ::CloseHandle(AsHandle(file)) != 0;
}

std::int64_t NowSecondsWindows() { return static_cast<std::int64_t>(::_time64(nullptr)); }

std::int64_t SteadyMillisecondsWindows() { return static_cast<std::int64_t>(::GetTickCount64()); }

// Sleep rounds up to the timer tick (about 15.6 ms); the caller's deadline,
// not the number of pauses, bounds a wait.
void SleepMillisecondsWindows(int milliseconds) { ::Sleep(static_cast<DWORD>(milliseconds)); }

// Releases the list of CommandLineToArgvW, once, also when a copy throws.
struct ArgvRelease {
  void operator()(LPWSTR *list) const { ::LocalFree(list); }
};

bool ArgumentListWindows(ArgumentList &args) {
  args.clear();
  int count = 0;
  const std::unique_ptr<LPWSTR, ArgvRelease> list(::CommandLineToArgvW(::GetCommandLineW(), &count));
  if (!list) return false;
  // The units are copied as they are: wchar_t is a UTF-16 unit here too.
  static_assert(sizeof(wchar_t) == sizeof(char16_t));
  args.reserve(count > 0 ? static_cast<std::size_t>(count) : 0);
  for (int i = 0; i < count; ++i) {
    std::u16string units;
    for (const wchar_t *p = list.get()[i]; *p != L'\0'; ++p) units.push_back(static_cast<char16_t>(*p));
    args.push_back(std::move(units));
  }
  return true;
}

const Calls kWindowsCalls = {
    .directory_exists = DirectoryExistsWindows,
    .make_directory = MakeDirectoryWindows,
    .make_private_directories = MakePrivateDirectoriesWindows,
    .open_log = OpenLogWindows,
    .file_size = FileSizeWindows,
    .append = AppendWindows,
    .truncate_file = TruncateFileWindows,
    .close_file = CloseFileWindows,
    .try_lock_file = TryLockFileWindows,
    .unlock_file = UnlockFileWindows,
    .now_seconds = NowSecondsWindows,
    .steady_milliseconds = SteadyMillisecondsWindows,
    .sleep_milliseconds = SleepMillisecondsWindows,
    .argument_list = ArgumentListWindows,
};

Calls g_calls = kWindowsCalls;

} // namespace

Calls &calls() { return g_calls; }
const Calls &native_calls() { return kWindowsCalls; }

StorageLocation default_storage_location() {
  // Fixed, machine-wide paths: every game on the machine writes below them.
  StorageLocation where;
  where.root = "C:\\Orvane\\";
  where.logs = "C:\\Orvane\\Logs\\";
  return where;
}

std::string_view line_break() { return "\r\n"; }

// Windows threads are not cancelled from outside the way POSIX threads are,
// and Windows processes do not fork.
int DisableCancellation() noexcept { return 0; }
void RestoreCancellation(int) {}
void RunInForkedChildren(void (*)()) {}

} // namespace orvane::platform
