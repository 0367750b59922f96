#include "options.h"

#include "help_text.h"

#include "OrvaneSDKVersion.h"

#include <cstdio>
#include <cstdlib>
#include <string_view>

namespace orvane::logcat {
namespace {

bool Complain(const std::string &text) {
  std::fprintf(stderr, "orvane-logcat: %s\n", text.c_str());
  return false;
}

// Stores the value of an option that takes one; false on a bad value.
bool TakeValue(Options &options, std::string_view name, const std::string &value) {
  if (name == "--key-game-id") {
    options.key_game_ids.push_back(value);
  } else if (name == "--type") {
    if (!IsEventType(value)) return Complain("--type takes INIT, ENTER, EXIT or SPECIAL, not " + value);
    options.filter.types.push_back(value);
  } else if (!IsTimeBound(value)) {
    return Complain(std::string(name) + " takes YYYY-MM-DD or YYYY-MM-DDTHH:MM:SS (UTC), not " + value);
  } else {
    (name == "--since" ? options.filter.since : options.filter.until) = value;
  }
  return true;
}

} // namespace

std::optional<Options> ParseOptions(int argc, char **argv) {
  Options options;
  bool only_paths = false;
  for (int i = 1; i < argc; ++i) {
    const std::string_view arg = argv[i];
    if (only_paths || arg == "-" || !arg.starts_with("-")) {
      options.paths.emplace_back(arg);
      continue;
    }
    const std::string_view name = arg.substr(0, arg.find('='));
    if (name == "--key-game-id" || name == "--since" || name == "--until" || name == "--type") {
      std::string value;
      if (name.size() < arg.size()) {
        value = arg.substr(name.size() + 1);
      } else if (i + 1 < argc) {
        value = argv[++i];
      } else {
        Complain(std::string(name) + " needs a value");
        return std::nullopt;
      }
      if (!TakeValue(options, name, value)) return std::nullopt;
    } else if (arg == "--") {
      only_paths = true;
    } else if (arg == "--help") {
      std::fwrite(kHelpText.data(), 1, kHelpText.size(), stdout);
      std::exit(0);
    } else if (arg == "--version") {
      std::printf("orvane-logcat %s\n", ORVANE_SDK_VERSION_STRING);
      std::exit(0);
    } else if (arg == "--check") {
      options.check = true;
    } else if (arg == "--follow") {
      options.follow = true;
    } else if (arg == "--show-key") {
      options.show_key = true;
    } else if (arg == "--with-file") {
      options.with_file = true;
    } else {
      Complain("unknown option " + std::string(arg));
      return std::nullopt;
    }
  }
  if (options.check && options.follow) {
    Complain("--check and --follow do not go together: a followed file has no end to sum up at");
    return std::nullopt;
  }
  if (!WindowIsOpen(options.filter)) {
    Complain("--since " + options.filter.since + " is after --until " + options.filter.until);
    return std::nullopt;
  }
  return options;
}

} // namespace orvane::logcat
