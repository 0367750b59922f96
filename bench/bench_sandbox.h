// A private data directory for benchmarks and drivers, so that nothing they
// record lands in the real home directory.
#pragma once

#include "OrvaneSDK.h"
#include "platform/platform.h"

#include <cstdint>
#include <string>

namespace orvane::bench {

struct Sandbox {
  std::string base; // a fresh directory under the temp directory
  platform::StorageLocation where;
};

// Creates the directory and points the library's storage at it; the storage
// directories themselves are not created.
Sandbox OpenSandbox();
// Removes the directory and everything in it.
void CloseSandbox(const Sandbox &sandbox);

// A callback that does nothing, standing for a host that only listens.
void ORVANE_CALL IgnoreMessage(LogLevel level, const char *message);

// Size of the file at `path`, -1 when it is missing.
std::int64_t FileSize(const std::string &path);

// Resident memory of this process in bytes.
std::int64_t ResidentBytes();

} // namespace orvane::bench
