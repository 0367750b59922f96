#include "support/host_runner.h"

#include <regex>

namespace orvane::testing {

HostRun HostTest::Run(const std::vector<std::string> &args, const std::string &arg0) {
  std::vector<std::string> argv = {arg0, "--library", ORVANE_LIBRARY_PATH};
  argv.insert(argv.end(), args.begin(), args.end());
  ChildResult child = RunChild(ORVANE_HOST_PATH, argv, {{"XDG_DATA_HOME", data_}});
  HostRun run{child.exit_code, child.output, {}};
  static const std::regex message(R"(^  \[(\d) [A-Z]+\] (.*)$)");
  for (std::string line : SplitLines(child.output)) {
    if (!line.empty() && line.back() == '\r') line.pop_back();
    std::smatch m;
    if (std::regex_match(line, m, message)) run.messages.push_back({std::stoi(m[1]), m[2]});
  }
  return run;
}

std::vector<std::string> HostTest::Records(const std::string &game_id, const std::string &key_game_id) {
  std::vector<std::string> records;
  const std::optional<std::string> content = ReadFile(LogPath(game_id));
  if (!content) return records;
  static const std::regex time(R"("time":"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d")");
  for (const std::string &line : SplitLines(*content)) {
    std::optional<std::string> plain = DecryptLine(line, KeyTextFor(key_game_id));
    records.push_back(plain ? std::regex_replace(*plain, time, "\"time\":\"T\"") : "(undecryptable)");
  }
  return records;
}

} // namespace orvane::testing
