// The launch identity through a real Windows command line: the sample host is
// started with CreateProcessW, reads its identity with GetCommandLineW and
// CommandLineToArgvW inside the DLL, and frees every non-empty result with
// the C runtime's free.
#include "support/child_process.h"

#include <gtest/gtest.h>

#include <windows.h>

#include <string>
#include <vector>

namespace orvane::testing {
namespace {

// orvane-host.exe and OrvaneSDK.dll are built beside the test programs.
std::string HostPath() {
  char path[MAX_PATH];
  DWORD n = ::GetModuleFileNameA(nullptr, path, MAX_PATH);
  while (n > 0 && path[n - 1] != '\\' && path[n - 1] != '/') --n;
  return std::string(path, n) + "orvane-host.exe";
}

std::string WithoutCr(std::string text) {
  std::erase(text, '\r');
  return text;
}

std::string Shown(const char *call, const std::string &value, const char *message_ok,
                  const char *message_failed) {
  if (value.empty())
    return std::string("  [2 ERROR] [OrvaneSDK] ") + message_failed + "\n" + call +
           "() = \"\" (not found)\n";
  return std::string("  [0 INFO] [OrvaneSDK] ") + message_ok + "\n" + call + "() = \"" + value +
         "\"\n";
}

TEST(HostIdentityWindows, ValuesFromTheProcessCommandLine) {
  struct Case {
    std::vector<std::string> launcher_args; // UTF-8 here, UTF-16 in the child
    std::string user_uuid;                   // narrowed bytes, empty: not found
    std::string game_id;
  };
  const Case cases[] = {
      // Quoted arguments with spaces arrive whole.
      {{"--userUuid--a1b2 c3d4", "--gameId--space race"}, "a1b2 c3d4", "space race"},
      // U+00E9 narrows to the one byte 0xE9, not to its UTF-8 form.
      {{"--gameId--caf\u00e9"}, "", "caf\xe9"},
      // Only the low byte of a unit counts: U+0141 is 'A', U+4E2D is '-'.
      {{"--gameId--\u0141\u4e2d"}, "", "A-"},
      {{"\u4e2d\u4e2duserUuid\u4e2d\u4e2dx"}, "x", ""},
      // Quotes and backslashes survive the command line's quoting rules.
      {{R"(--userUuid--say "hi" \\srv\x\)", R"(--gameId--C:\Games\)"},
       R"(say "hi" \\srv\x\)",
       R"(C:\Games\)"},
      // The marker alone, with the value in the next argument, finds nothing.
      {{"--userUuid--", "u1", "--gameId--", "g1"}, "", ""},
  };
  const std::string host = HostPath();
  for (const Case &c : cases) {
    std::vector<std::string> args = {host, "uuid", "gameid", "--"};
    args.insert(args.end(), c.launcher_args.begin(), c.launcher_args.end());
    const ChildResult run = RunChild(host, args);
    const std::string expected =
        "oRegisterForLogs(print_message)\n"
        "  [0 INFO] [OrvaneSDK] Logging initiated.\n" +
        Shown("oAuthGetUserUuid", c.user_uuid, "Authentication - OK", "Authentication - Failed") +
        Shown("oAuthGetGameId", c.game_id, "Return GameID - OK", "Return GameID - Empty");
    EXPECT_EQ(run.exit_code, 0) << c.launcher_args[0];
    EXPECT_EQ(WithoutCr(run.output), expected) << c.launcher_args[0];
  }
}

// A program path with a space is quoted as argument 0 and searched like any
// other argument.
TEST(HostIdentityWindows, ArgumentZeroIsSearched) {
  const std::string host = HostPath();
  const ChildResult run =
      RunChild(host, {"C:\\Program Files\\--gameId--x y\\game.exe", "gameid", "--", "--gameId--g9"});
  EXPECT_EQ(run.exit_code, 0);
  EXPECT_NE(WithoutCr(run.output).find("oAuthGetGameId() = \"x y\\game.exe\"\n"), std::string::npos)
      << run.output;
}

} // namespace
} // namespace orvane::testing
