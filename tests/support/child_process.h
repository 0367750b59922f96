// Runs a program as a child process and collects what it printed.
#pragma once

#include <string>
#include <utility>
#include <vector>

namespace orvane::testing {

struct ChildResult {
  int exit_code = -1; // -1 when it could not run or did not exit normally
  std::string output; // standard output and standard error, interleaved
};

// Runs `program` with `args` (args[0] is the child's argument 0, which need
// not be the program's name) and the current environment plus `env`.
// Kills the child after `timeout_seconds`.
ChildResult RunChild(const std::string &program, const std::vector<std::string> &args,
                     const std::vector<std::pair<std::string, std::string>> &env = {},
                     int timeout_seconds = 30);

} // namespace orvane::testing
