#include "bench_sandbox.h"

#include "core/storage.h"

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <unistd.h>

namespace orvane::bench {

Sandbox OpenSandbox() {
  std::string pattern = (std::filesystem::temp_directory_path() / "orvane-bench-XXXXXX").string();
  if (::mkdtemp(pattern.data()) == nullptr) {
    std::perror("mkdtemp");
    std::exit(1);
  }
  Sandbox sandbox;
  sandbox.base = pattern;
  sandbox.where.base = pattern;
  sandbox.where.root = pattern + "/Orvane/";
  sandbox.where.logs = sandbox.where.root + "Logs/";
  SetStorageForTesting(sandbox.where);
  return sandbox;
}

void CloseSandbox(const Sandbox &sandbox) {
  std::error_code error;
  std::filesystem::remove_all(sandbox.base, error);
}

void ORVANE_CALL IgnoreMessage(LogLevel, const char *) {}

std::int64_t FileSize(const std::string &path) {
  std::error_code error;
  const auto size = std::filesystem::file_size(path, error);
  return error ? -1 : static_cast<std::int64_t>(size);
}

std::int64_t ResidentBytes() {
  // The second field of statm is the resident page count.
  long pages = 0, resident = 0;
  std::FILE *statm = std::fopen("/proc/self/statm", "r");
  if (statm == nullptr) return -1;
  const int read = std::fscanf(statm, "%ld %ld", &pages, &resident);
  std::fclose(statm);
  return read == 2 ? static_cast<std::int64_t>(resident) * ::sysconf(_SC_PAGESIZE) : -1;
}

} // namespace orvane::bench
