#include "log_sources.h"

#include "platform/platform.h"

#include <algorithm>
#include <system_error>

namespace orvane::logcat {

std::optional<std::string> GameIdOfLogName(const std::filesystem::path &file) {
  // The library names a log by the game id's own bytes, so the narrow form
  // of the name gives those bytes back.
  const std::string name = file.filename().string();
  constexpr std::string_view kExtension = ".log";
  if (name.size() <= kExtension.size() || !name.ends_with(kExtension)) return std::nullopt;
  return name.substr(0, name.size() - kExtension.size());
}

std::vector<std::filesystem::path> LogFilesIn(const std::filesystem::path &folder, std::error_code &error) {
  std::vector<std::filesystem::path> files;
  for (std::filesystem::directory_iterator entry(folder, error), end; !error && entry != end;
       entry.increment(error)) {
    // Whatever is not a folder: a FIFO, a device or a link that leads nowhere
    // is reported when it is read, never skipped in silence.
    std::error_code type_error;
    if (GameIdOfLogName(entry->path()) && !entry->is_directory(type_error)) files.push_back(entry->path());
  }
  std::sort(files.begin(), files.end());
  return files;
}

std::vector<std::string> GameIdsIn(const std::filesystem::path &folder) {
  std::vector<std::string> ids;
  std::error_code error;
  for (const auto &file : LogFilesIn(folder, error)) ids.push_back(*GameIdOfLogName(file));
  return ids;
}

std::filesystem::path DefaultLogsFolder() {
  return std::filesystem::path(platform::default_storage_location().logs);
}

} // namespace orvane::logcat
