// The command line of orvane-logcat.
#pragma once

#include "record_filter.h"

#include <optional>
#include <string>
#include <vector>

namespace orvane::logcat {

struct Options {
  std::vector<std::string> paths;        // files, folders, "-" for standard input
  std::vector<std::string> key_game_ids; // tried after the file's own and its folder's
  RecordFilter filter;
  bool check = false;
  bool follow = false;
  bool show_key = false;
  bool with_file = false;
};

// The options of `argv`; nullopt after a usage error was reported on
// standard error. --help and --version print and end the process.
std::optional<Options> ParseOptions(int argc, char **argv);

} // namespace orvane::logcat
