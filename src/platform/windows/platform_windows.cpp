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

bool MakeDirectoryWindows(const char *path) { return ::_mkdir(path) == 0; }

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

FileHandle OpenAppendWindows(const char *path) {
  // Append data without write data: the system places every WriteFile at the
  // end of the file at that moment, so lines of concurrent writers never
  // overwrite each other. Read data is there for the byte-range lock, read
  // attributes for the size. Every sharing mode is allowed, so that other
  // handles and processes (the nested INIT run, a second game, a reader) may
  // open the file meanwhile.
  const HANDLE file = ::CreateFileA(
      path, FILE_READ_DATA | FILE_APPEND_DATA | FILE_READ_ATTRIBUTES | SYNCHRONIZE,
      FILE_SHARE_READ | FILE_SHARE_WRITE | FILE_SHARE_DELETE, nullptr, OPEN_ALWAYS,
      FILE_ATTRIBUTE_NORMAL, nullptr);
  if (file == INVALID_HANDLE_VALUE) return kNoFile;
  return reinterpret_cast<FileHandle>(file);
}

std::int64_t FileSizeWindows(FileHandle file) {
  LARGE_INTEGER size;
  if (!::GetFileSizeEx(AsHandle(file), &size)) return -1;
  return size.QuadPart;
}

bool AppendWindows(FileHandle file, const void *data, std::size_t size) {
  // One write call, as on POSIX: a short write is a failure, since retrying
  // would split the line.
  if (size > MAXDWORD) return false;
  DWORD written = 0;
  return ::WriteFile(AsHandle(file), data, static_cast<DWORD>(size), &written, nullptr) &&
         written == size;
}

bool CloseFileWindows(FileHandle file) { return ::CloseHandle(AsHandle(file)) != 0; }

// Byte-range locks on Windows are mandatory: a write into a locked range
// fails. The lock therefore covers one byte far beyond any real file size,
// where no append ever lands; it only serves as a token between processes.
constexpr DWORD kLockOffsetHigh = 0x40000000; // byte 2^62

OVERLAPPED LockRange() {
  OVERLAPPED where{};
  where.Offset = 0;
  where.OffsetHigh = kLockOffsetHigh;
  return where;
}

bool LockFileWindows(FileHandle file) {
  constexpr int kAttempts = 200; // 200 x 5 ms: one second at the most
  for (int i = 0; i < kAttempts; ++i) {
    OVERLAPPED where = LockRange();
    if (::LockFileEx(AsHandle(file), LOCKFILE_EXCLUSIVE_LOCK | LOCKFILE_FAIL_IMMEDIATELY, 0, 1, 0,
                     &where))
      return true;
    if (::GetLastError() != ERROR_LOCK_VIOLATION) return false;
    ::Sleep(5);
  }
  return false;
}

void UnlockFileWindows(FileHandle file) {
  OVERLAPPED where = LockRange();
  ::UnlockFileEx(AsHandle(file), 0, 1, 0, &where);
}

std::int64_t NowSecondsWindows() { return static_cast<std::int64_t>(::_time64(nullptr)); }

// Releases the list of CommandLineToArgvW, once, also when a copy throws.
struct ArgvRelease {
  void operator()(LPWSTR *list) const { ::LocalFree(list); }
};

bool ArgumentListWindows(ArgumentList &args) {
  args.clear();
  int count = 0;
  const std::unique_ptr<LPWSTR, ArgvRelease> list(
      ::CommandLineToArgvW(::GetCommandLineW(), &count));
  if (!list) return false;
  // The units are copied as they are: wchar_t is a UTF-16 unit here too.
  static_assert(sizeof(wchar_t) == sizeof(char16_t));
  args.reserve(count > 0 ? static_cast<std::size_t>(count) : 0);
  for (int i = 0; i < count; ++i) {
    std::u16string units;
    for (const wchar_t *p = list.get()[i]; *p != L'\0'; ++p)
      units.push_back(static_cast<char16_t>(*p));
    args.push_back(std::move(units));
  }
  return true;
}

const Calls kWindowsCalls = {
    DirectoryExistsWindows, MakeDirectoryWindows, MakePrivateDirectoriesWindows,
    OpenAppendWindows,      FileSizeWindows,      AppendWindows,
    CloseFileWindows,       LockFileWindows,      UnlockFileWindows,
    NowSecondsWindows,      ArgumentListWindows,
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

} // namespace orvane::platform
