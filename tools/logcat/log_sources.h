// Where logs are found: log file names, the files of a folder, and the
// library's own Logs folder.
#pragma once

#include <filesystem>
#include <optional>
#include <string>
#include <string_view>
#include <system_error>
#include <vector>

namespace orvane::logcat {

// The game id that a log's file name gives ("g1.log" gives "g1"), or
// nullopt for a name that does not end in ".log".
std::optional<std::string> GameIdOfLogName(const std::filesystem::path &file);

// The *.log entries directly inside `folder` that are not folders, sorted by
// name; `error` tells why when it cannot be listed (or not to its end).
std::vector<std::filesystem::path> LogFilesIn(const std::filesystem::path &folder, std::error_code &error);

// The game ids of the *.log files directly inside `folder`; none when it
// cannot be listed.
std::vector<std::string> GameIdsIn(const std::filesystem::path &folder);

// The folder the library writes to on this machine, by the library's own
// storage rule, so that reader and writer cannot disagree.
std::filesystem::path DefaultLogsFolder();

} // namespace orvane::logcat
