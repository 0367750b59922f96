// orvane-logcat as QA and the back end run it, on folders that processes of
// the sample host wrote; records checked against an independent decryption.
#include "support/test_support.h"
#include "support/test_support.h"

#include <gtest/gtest.h>

#include <regex>
#include <thread>

namespace orvane::testing {
namespace {

std::vector<std::string> SplitLines(std::string_view text) { return Split(text, "\n"); }

struct Output { int exit_code = -1; std::string out, err; };

class LogcatTest : public ::testing::Test {
protected:
  void SetUp() override { dir_ = MakeTempDirectory(), logs_ = dir_ + "/Orvane/Logs/"; }
  void TearDown() override { RemoveTree(dir_); }

  // One process of the sample host: its first game id keys every log it writes.
  void Host(std::vector<std::string> calls, int exit_code = 0) {
    calls.insert(calls.begin(), "orvane-host");
    const ChildResult result = RunChild(ORVANE_HOST_PATH, calls, {{"XDG_DATA_HOME", dir_}});
    ASSERT_EQ(result.exit_code, exit_code) << result.output;
  }

  // Runs `program` (orvane-logcat unless named) with its output streams apart
  // and `input` on standard input, or the null device when that is empty.
  Output Run(std::vector<std::string> args, const std::string &input = "", int timeout_seconds = 30,
             const char *program = ORVANE_LOGCAT_PATH) {
    WriteFile(dir_ + "/stdin", input);
    std::string command = "exec \"$0\"";
    for (std::size_t i = 1; i <= args.size(); ++i) command += " \"$" + std::to_string(i) + "\"";
    command += input.empty() ? " </dev/null 2>\"$T/stderr\"" : " <\"$T/stdin\" 2>\"$T/stderr\"";
    args.insert(args.begin(), {"sh", "-c", command, program});
    const ChildResult result = RunChild("/bin/sh", args, {{"T", dir_}, {"XDG_DATA_HOME", dir_}}, timeout_seconds);
    return {result.exit_code, result.output, ReadFile(dir_ + "/stderr").value_or("")};
  }

  // Each line's record, decrypted under the first of `keys` that gives one.
  std::string Stored(const std::string &game, const std::vector<std::string> &keys) {
    std::string records;
    for (const std::string &line : SplitLines(ReadFile(logs_ + game + ".log").value_or("")))
      for (const std::string &key : keys)
        if (auto plain = DecryptLine(line, KeyTextFor(key)); plain && plain->starts_with("{\"user_id\"")) {
          records += *plain + "\n";
          break;
        }
    return records;
  }

  std::string dir_, logs_;
};

TEST_F(LogcatTest, ReadsEveryLineOfAFolderThatProcessesWroteInAnyOrder) {
  Host({"init", "gA", "u1", "enter", "gB", "u1"}); // both logs keyed by gA
  Host({"enter", "gB", "u2", "enter", "gA", "u2"}); // ... then by gB
  Host({"exit", "gA", "u3", "exit", "gB", "u3"});   // ... then by gA again
  const std::string a = Stored("gA", {"gA", "gB"}), b = Stored("gB", {"gA", "gB"});
  ASSERT_EQ(std::count(a.begin(), a.end(), '\n') + std::count(b.begin(), b.end(), '\n'), 7);
  const std::pair<std::vector<std::string>, std::string> modes[] = {
      {{logs_}, a + b}, {{logs_ + "gB.log"}, b}, {{}, a + b}}; // no argument: the library's folder
  for (const auto &[args, expected] : modes) {
    const Output result = Run(args);
    EXPECT_EQ(result.exit_code, 0) << result.err;
    EXPECT_EQ(result.out, expected) << result.err;
  }
  const Output shown = Run({"--show-key", "--with-file", logs_});
  std::string keys;
  static const std::regex kAdded(R"re(,"file":"(g.\.log)","key_game_id":"(g.)"\}\n)re");
  for (std::sregex_iterator m(shown.out.begin(), shown.out.end(), kAdded), end; m != end; ++m)
    keys += (*m)[1].str() + ":" + (*m)[2].str() + " ";
  EXPECT_EQ(keys, "gA.log:gA gA.log:gB gA.log:gA gB.log:gA gB.log:gA gB.log:gB gB.log:gA ");

  // A process whose first game left no log: no candidate reads its line. One
  // whose first call had an empty game id: the fixed key text alone reads it.
  Host({"init", "gZ", "u4", "exit", "gA", "u4"});
  Host({"init", "", "u5", "exit", "gA", "u5"}, 1); // the refused call makes it exit 1
  std::remove((logs_ + "gZ.log").c_str());
  const Output bad = Run({logs_});
  EXPECT_EQ(std::pair(bad.exit_code, bad.out), std::pair(1, Stored("gA", {"gA", "gB", ""}) + b));
  EXPECT_TRUE(bad.err.starts_with("orvane-logcat: " + logs_ + "gA.log:4: does not decrypt")) << bad.err;
  EXPECT_EQ(std::count(bad.err.begin(), bad.err.end(), '\n'), 1) << bad.err;
  EXPECT_EQ(Run({"--key-game-id", "gZ", "--check", logs_}).exit_code, 0); // named, it reads every line
}

TEST_F(LogcatTest, AnyStoredBytesComeOutAsValidUtf8Json) {
  std::string extra = "q\" b\\ n\n t\t cut \xe2\x82x overlong \xc0\xaf all ", hex;
  for (int c = 0x80; c <= 0xff; ++c) extra += static_cast<char>(c);
  for (unsigned char c : extra) hex += {"0123456789abcdef"[c >> 4], "0123456789abcdef"[c & 15]};
  Host({"init", "g1", "u1", "special", "g1", "u1", extra});
  const Output result = Run({logs_ + "g1.log"});
  ASSERT_EQ(result.exit_code, 0) << result.err;
  // A strict parser; each \u00XX read as Latin-1 gives the stored byte back.
  const Output parsed = Run({"-c", "import json,sys\nfor l in sys.stdin.buffer:\n"
                                   " print(json.loads(l.decode())['extra'].encode('latin-1').hex())"},
                            result.out, 30, ORVANE_PYTHON_PATH);
  EXPECT_EQ(parsed.exit_code, 0) << parsed.err;
  EXPECT_EQ(parsed.out, "\n" + hex + "\n");
  EXPECT_EQ(Run({"--check", logs_}).out, logs_ + "g1.log: 2 records, 0 bad lines, 1 records with bytes not UTF-8\n");
  // Standard input is read when it is given, with the key named.
  const std::string special = SplitLines(*ReadFile(logs_ + "g1.log"))[1];
  EXPECT_EQ(Run({"--key-game-id", "g1"}, special + "\r\n").out, SplitLines(result.out)[1] + "\n");
}

TEST_F(LogcatTest, FollowsAFolderThroughItsFilters) {
  Host({"init", "g0", "u0"});
  Output followed;
  std::thread follower([&] {
    followed = Run({"--follow", "--type", "SPECIAL", "--type", "EXIT", "--since", "2000-01-01", logs_}, "", 4);
  });
  std::this_thread::sleep_for(std::chrono::milliseconds(500));
  Host({"enter", "g1", "u1", "special", "g1", "u1", "s"}); // a log that appears later
  std::this_thread::sleep_for(std::chrono::milliseconds(300)); // read while the special is unended
  Host({"enter", "g1", "u1", "exit", "g1", "u1"});
  follower.join();
  const std::vector<std::string> records = SplitLines(Stored("g1", {"g1"})); // INIT ENTER SPECIAL ENTER EXIT
  ASSERT_EQ(records.size(), 6u);
  EXPECT_EQ(followed.out, records[2] + "\n" + records[4] + "\n") << followed.err;
}

TEST_F(LogcatTest, UsageHelpAndVersion) {
  const std::pair<std::vector<std::string>, std::string> cases[] = {
      {{"--frobnicate"}, "unknown option --frobnicate"}, {{"--until"}, "--until needs a value"},
      {{"--since", "yesterday"}, "--since takes YYYY-MM-DD"}, {{"--type", "exit"}, "--type takes INIT"},
      {{"--check", "--follow"}, "do not go together"}, {{"-"}, "standard input has no file name"},
      {{dir_ + "/stdin"}, "does not end in .log"}, {{logs_ + "g.log"}, "g.log: cannot open"}};
  for (const auto &[args, message] : cases) {
    const Output result = Run(args);
    EXPECT_TRUE(result.exit_code == 2 && result.err.find(message) != result.err.npos) << message << "\n" << result.err;
  }
  const std::string help = Run({"--help"}).out;
  const char *options[] = {"--key-game-id ID", "--show-key", "--with-file", "--since TIME", "--until TIME",
                           "--type TYPE", "--check", "--follow", "--version", "--help", "--"};
  for (const char *option : options) EXPECT_NE(help.find("\n    " + std::string(option) + "\n"), help.npos) << option;
  static const std::regex kExample("\n        Example: orvane-logcat ");
  EXPECT_EQ(std::distance(std::sregex_iterator(help.begin(), help.end(), kExample), {}), std::size(options));
  EXPECT_EQ(Run({"--version"}).out, "orvane-logcat " ORVANE_VERSION "\n");
}

} // namespace
} // namespace orvane::testing
