#include "support/test_support.h"

#include <cstdio>
#include <sys/wait.h>

namespace orvane::testing {

// Through the shell: `timeout` ends a child that hangs, `env` adds its
// variables, and bash's `exec -a` gives it the argument 0 a launcher would.
ChildResult RunChild(const std::string &program, const std::vector<std::string> &args,
                     const std::vector<std::pair<std::string, std::string>> &env, int timeout_seconds) {
  std::string command = "timeout -s KILL " + std::to_string(timeout_seconds) + " env";
  const auto add = [&command](const std::string &word) { // quoted for the shell
    command += " '";
    for (const char c : word) c == '\'' ? command.append("'\\''") : command.append(1, c);
    command += '\'';
  };
  for (const auto &[name, value] : env) add(name + "=" + value);
  command += " bash -c 'exec -a \"$0\" \"$@\" 2>&1'";
  add(args.empty() ? program : args[0]);
  add(program);
  for (std::size_t i = 1; i < args.size(); ++i) add(args[i]);
  command += " 2>/dev/null"; // the shell's own notice of a killed child
  ChildResult result;
  std::FILE *child = ::popen(command.c_str(), "r");
  if (child == nullptr) return result;
  char buffer[4096];
  for (std::size_t n; (n = std::fread(buffer, 1, sizeof buffer, child)) != 0;)
    result.output.append(buffer, n);
  const int status = ::pclose(child);
  if (WIFEXITED(status) && WEXITSTATUS(status) != 137 && WEXITSTATUS(status) != 124)
    result.exit_code = WEXITSTATUS(status);
  return result;
}

} // namespace orvane::testing
