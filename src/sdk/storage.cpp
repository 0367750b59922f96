#include "sdk/storage.h"

namespace orvane {
namespace {

// Built when the library is loaded, from the environment of that moment.
platform::StorageLocation g_storage = platform::default_storage_location();

} // namespace

const platform::StorageLocation &Storage() { return g_storage; }

void SetStorageForTesting(platform::StorageLocation where) { g_storage = std::move(where); }

bool DirectoryExists(const char *path) {
  return path[0] != '\0' && platform::calls().directory_exists(path);
}

void InitializeStorage(MessageBatch &messages) {
  const platform::StorageLocation &where = Storage();
  const platform::Calls &os = platform::calls();
  if (!DirectoryExists(where.logs.c_str())) {
    if (!DirectoryExists(where.root.c_str())) {
      // The base stands where Windows has its drive root; it is created only
      // when missing, like a fresh account's ~/.local/share.
      if (!where.base.empty() && !DirectoryExists(where.base.c_str()))
        os.make_private_directories(where.base.c_str());
      if (!where.root.empty()) os.make_directory(where.root.c_str());
    }
    if (!where.logs.empty()) os.make_directory(where.logs.c_str());
    // Report what the disk shows, not what was attempted: a creation that
    // failed must not read as success.
    if (!DirectoryExists(where.logs.c_str())) {
      messages.Add(LogLevel::Error, "[OrvaneSDK] Initialize() - failed.");
      return;
    }
  }
  messages.Add(LogLevel::Info, "[OrvaneSDK] Initialize() - OK.");
}

} // namespace orvane
