#include "core/storage.h"

#include <atomic>

namespace orvane {
namespace {

// Found on first use, not at load: finding it reads the environment and may
// ask the account database, which a game's start must not wait for. Never
// destroyed, so that calls from exit handlers and static destructors of the
// game still see it.
std::atomic<const platform::StorageLocation *> g_storage{nullptr};

} // namespace

const platform::StorageLocation &Storage() {
  if (const platform::StorageLocation *where = g_storage.load(std::memory_order_acquire)) return *where;
  static const platform::StorageLocation *const found =
      new platform::StorageLocation(platform::default_storage_location());
  const platform::StorageLocation *expected = nullptr;
  g_storage.compare_exchange_strong(expected, found, std::memory_order_acq_rel);
  return *g_storage.load(std::memory_order_acquire);
}

void SetStorageForTesting(platform::StorageLocation where) {
  // One slot for every test; a test sets it while no call runs.
  static platform::StorageLocation *const slot = new platform::StorageLocation;
  *slot = std::move(where);
  g_storage.store(slot, std::memory_order_release);
}

bool DirectoryExists(const char *path) { return path[0] != '\0' && platform::calls().directory_exists(path); }

void InitializeStorage(MessageBatch &messages) {
  const platform::StorageLocation &where = Storage();
  if (!DirectoryExists(where.logs.c_str())) {
    // The library's own levels first: a root that an earlier run left
    // without its owner's rights takes no logs directory. Then every level
    // still missing, the base's parents included, like a fresh account's
    // ~/.local/share.
    MendStorage();
    if (!where.logs.empty()) platform::calls().make_private_directories(where.logs.c_str());
    // Report what the disk shows, not what was attempted: a creation that
    // failed must not read as success.
    if (!DirectoryExists(where.logs.c_str())) {
      messages.Add(LogLevel::Error, "[OrvaneSDK] Initialize() - failed.");
      return;
    }
  }
  messages.Add(LogLevel::Info, "[OrvaneSDK] Initialize() - OK.");
}

void MendStorage() {
  const platform::StorageLocation &where = Storage();
  const platform::Calls &os = platform::calls();
  if (!where.root.empty()) os.make_directory(where.root.c_str());
  if (!where.logs.empty()) os.make_directory(where.logs.c_str());
}

} // namespace orvane
