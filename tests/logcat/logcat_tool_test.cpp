// orvane-logcat as QA and CI run it: logs written by the library through the
// sample host, read back, checked and followed.
#include "support/child_process.h"
#include "support/test_support.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <fcntl.h>
#include <poll.h>
#include <regex>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <string>
#include <vector>

extern char **environ;

namespace orvane::testing {
namespace {

struct Output {
  int exit_code = -1;
  std::string out; // standard output
  std::string err; // standard error
};

class LogcatTest : public ::testing::Test {
protected:
  void SetUp() override {
    dir_ = MakeTempDirectory();
    logs_ = dir_ + "/Orvane/Logs/";
  }
  void TearDown() override { RemoveTree(dir_); }

  // Runs the sample host with this test's data directory.
  void Host(std::vector<std::string> calls) {
    calls.insert(calls.begin(), "orvane-host");
    const ChildResult result = RunChild(ORVANE_HOST_PATH, calls, {{"XDG_DATA_HOME", dir_}});
    ASSERT_EQ(result.exit_code, 0) << result.output;
  }

  // Runs orvane-logcat with `args`, keeping its two output streams apart.
  Output Logcat(const std::vector<std::string> &args, const std::string &input = "") {
    WriteFile(dir_ + "/stdin", input);
    std::string command = "exec \"$0\"";
    for (std::size_t i = 0; i < args.size(); ++i) command += " \"$" + std::to_string(i + 1) + "\"";
    command += " <\"$ORVANE_TEST_DIR/stdin\" 2>\"$ORVANE_TEST_DIR/stderr\"";
    std::vector<std::string> argv = {"sh", "-c", command, ORVANE_LOGCAT_PATH};
    argv.insert(argv.end(), args.begin(), args.end());
    const ChildResult result = RunChild("/bin/sh", argv, {{"ORVANE_TEST_DIR", dir_}});
    return {result.exit_code, result.output, ReadFile(dir_ + "/stderr").value_or("")};
  }

  // Every line of the log decrypted independently, one record per output line.
  std::string ExpectedOutput(const std::string &game, const std::string &key_game_id) {
    std::string expected;
    for (const std::string &line : SplitLines(ReadFile(LogPath(game)).value_or(""))) {
      if (line.empty()) continue;
      const auto plain = DecryptLine(line, KeyTextFor(key_game_id));
      EXPECT_TRUE(plain.has_value()) << line;
      expected += plain.value_or("?") + "\n";
    }
    return expected;
  }

  std::string LogPath(const std::string &game) const { return logs_ + game + ".log"; }

  std::string dir_;
  std::string logs_;
};

// "...","time":"2024-05-17T08:30:00",... becomes "...","time":"T",...
std::string WithoutTimes(const std::string &text) {
  static const std::regex kTime(R"("time":"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d")");
  return std::regex_replace(text, kTime, R"("time":"T")");
}

TEST_F(LogcatTest, ReadsBackEveryEventTypeAndValue) {
  Host({"init", "g1", "u\"1", "enter", "g1", "u\"1", "special", "g1", "u\"1",
        "quote \" backslash \\ line\nfeed\ttab \xff\xfe end", "special", "g1", "u\"1", "",
        "exit", "g1", "u\"1"});
  const Output result = Logcat({LogPath("g1")});
  EXPECT_EQ(result.exit_code, 0) << result.err;
  EXPECT_EQ(result.err, "");
  // The exact record texts, independently decrypted ...
  EXPECT_EQ(result.out, ExpectedOutput("g1", "g1"));
  // ... which hold exactly what the host passed.
  EXPECT_EQ(WithoutTimes(result.out),
            "{\"user_id\":\"u\\\"1\",\"game_id\":\"g1\",\"type\":\"INIT\",\"time\":\"T\",\"extra\":\"\"}\n"
            "{\"user_id\":\"u\\\"1\",\"game_id\":\"g1\",\"type\":\"ENTER\",\"time\":\"T\",\"extra\":\"\"}\n"
            "{\"user_id\":\"u\\\"1\",\"game_id\":\"g1\",\"type\":\"SPECIAL\",\"time\":\"T\",\"extra\":"
            "\"quote \\\" backslash \\\\ line\\nfeed\\ttab \xff\xfe end\"}\n"
            "{\"user_id\":\"u\\\"1\",\"game_id\":\"g1\",\"type\":\"SPECIAL\",\"time\":\"T\",\"extra\":\"\"}\n"
            "{\"user_id\":\"u\\\"1\",\"game_id\":\"g1\",\"type\":\"EXIT\",\"time\":\"T\",\"extra\":\"\"}\n");

  const Output check = Logcat({"--check", LogPath("g1")});
  EXPECT_EQ(check.exit_code, 0);
  EXPECT_EQ(check.out, LogPath("g1") + ": 5 records, 0 bad lines\n");

  const Output piped = Logcat({"--key-game-id", "g1", "-"}, ReadFile(LogPath("g1")).value_or(""));
  EXPECT_EQ(piped.exit_code, 0) << piped.err;
  EXPECT_EQ(piped.out, result.out);
}

TEST_F(LogcatTest, ReportsDamagedLinesAndGoesOn) {
  Host({"init", "g1", "u1", "special", "g1", "u1", "level=3"});
  const std::vector<std::string> lines = SplitLines(ReadFile(LogPath("g1")).value_or(""));
  ASSERT_EQ(lines.size(), 2u);
  const std::string &good = lines[1];
  std::string flipped = good; // flips the padding byte of the last block
  flipped[good.size() - 34] = flipped[good.size() - 34] == '0' ? '8' : '0';
  const std::string damaged = "\n" + lines[0] + "\n" +              // 1 empty, 2 good
                              good.substr(1) + "\n" +               // 3 odd length
                              good.substr(0, 7) + "x" + good.substr(8) + "\n" + // 4 non-hex
                              flipped + "\n" +                      // 5 bad padding
                              good.substr(0, good.size() - 6) + "\n" + // 6 truncated block
                              good.substr(0, good.size() - 32) + "\n" + // 7 a block short
                              good;                                 // 8 good
  WriteFile(LogPath("g1"), damaged);

  const Output result = Logcat({LogPath("g1")});
  EXPECT_EQ(result.exit_code, 1);
  const std::string name = "orvane-logcat: " + LogPath("g1");
  EXPECT_EQ(result.err,
            name + ":3: not whole 16-byte blocks of hex\n" +
            name + ":4: not lowercase hex\n" +
            name + ":5: does not decrypt (bad padding: damaged line or wrong key game id)\n" +
            name + ":6: not whole 16-byte blocks of hex\n" +
            name + ":7: does not decrypt (bad padding: damaged line or wrong key game id)\n");
  EXPECT_EQ(result.out, *DecryptLine(lines[0], KeyTextFor("g1")) + "\n" +
                            *DecryptLine(good, KeyTextFor("g1")) + "\n");

  const Output check = Logcat({"--check", LogPath("g1")});
  EXPECT_EQ(check.exit_code, 1);
  EXPECT_EQ(check.out, LogPath("g1") + ": 2 records, 5 bad lines\n");
}

TEST_F(LogcatTest, ReadsWindowsLineBreaks) {
  Host({"init", "g1", "u1", "enter", "g1", "u1", "exit", "g1", "u1"});
  const std::string expected = ExpectedOutput("g1", "g1");
  std::string crlf = "\r\n"; // as a failed first write leaves it, in Windows form
  for (const std::string &line : SplitLines(ReadFile(LogPath("g1")).value_or(""))) crlf += line + "\r\n";
  crlf.resize(crlf.size() - 2);
  WriteFile(LogPath("g1"), crlf);

  const Output result = Logcat({LogPath("g1")});
  EXPECT_EQ(result.exit_code, 0) << result.err;
  EXPECT_EQ(result.out, expected);
  EXPECT_EQ(std::count(result.out.begin(), result.out.end(), '\n'), 3);
}

// A process encrypts every game's log under the first game id it saw.
TEST_F(LogcatTest, KeyGameIdForTheSecondGameOfAProcess) {
  const std::string first(70, 'f'); // only its first 65 bytes make the key
  Host({"init", first, "u1", "init", "g2", "u1", "special", "g2", "u1", "x"});
  const Output own_key = Logcat({"--check", LogPath("g2")});
  EXPECT_EQ(own_key.exit_code, 1);
  EXPECT_EQ(own_key.out, LogPath("g2") + ": 0 records, 2 bad lines\n");

  const Output result = Logcat({"--key-game-id", first.substr(0, 65) + "-whatever", LogPath("g2")});
  EXPECT_EQ(result.exit_code, 0) << result.err;
  EXPECT_EQ(result.out, ExpectedOutput("g2", first));
  EXPECT_NE(result.out.find("\"game_id\":\"g2\""), std::string::npos);

  // Several files, each summed up; one bad file makes the status 1.
  const Output both = Logcat({"--check", "--key-game-id=" + first, LogPath(first), LogPath("g2")});
  EXPECT_EQ(both.exit_code, 0);
  EXPECT_EQ(both.out, LogPath(first) + ": 1 records, 0 bad lines\n" + LogPath("g2") +
                          ": 2 records, 0 bad lines\n");
}

TEST_F(LogcatTest, UsageAndReadErrors) {
  Host({"init", "g1", "u1"});
  WriteFile(dir_ + "/g1.copy", ReadFile(LogPath("g1")).value_or(""));
  struct Case {
    std::vector<std::string> args;
    std::string message;
  };
  const Case cases[] = {
      {{}, "no log file given"},
      {{"--frobnicate", LogPath("g1")}, "unknown option --frobnicate"},
      {{LogPath("g1"), "--key-game-id"}, "--key-game-id needs a game id"},
      {{"-"}, "standard input has no file name"},
      {{dir_ + "/g1.copy"}, "the name does not end in .log"},
      {{"--check", "--follow", LogPath("g1")}, "--check and --follow do not go together"},
      {{LogPath("nope")}, LogPath("nope") + ": cannot open: No such file or directory"},
      {{LogPath("nope"), LogPath("g1")}, ": cannot open:"},
      {{logs_ + "/"}, ""},
  };
  for (const Case &c : cases) {
    const Output result = Logcat(c.args);
    std::string shown;
    for (const auto &a : c.args) shown += a + " ";
    EXPECT_EQ(result.exit_code, 2) << shown;
    EXPECT_NE(result.err.find(c.message), std::string::npos) << shown << "\n" << result.err;
  }
  // The readable file after the missing one was still read.
  EXPECT_EQ(Logcat({LogPath("nope"), LogPath("g1")}).out, ExpectedOutput("g1", "g1"));

  const Output help = Logcat({"--help"});
  EXPECT_EQ(help.exit_code, 0);
  for (const char *word : {"--key-game-id", "--check", "--follow", "JSON", "Exit status", "UTF-8"})
    EXPECT_NE(help.out.find(word), std::string::npos) << word;
}

// A running orvane-logcat --follow, read line by line.
struct Follower {
  pid_t pid = -1;
  int out = -1;
  std::string seen;

  // Waits until `count` lines have arrived; gives up after a generous bound
  // so that a broken follower fails the test instead of hanging it.
  bool WaitForLines(std::size_t count) {
    const auto deadline = std::chrono::steady_clock::now() + std::chrono::seconds(20);
    while (static_cast<std::size_t>(std::count(seen.begin(), seen.end(), '\n')) < count) {
      const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(
          deadline - std::chrono::steady_clock::now());
      if (left.count() <= 0) return false;
      pollfd p{out, POLLIN, 0};
      if (::poll(&p, 1, static_cast<int>(left.count())) <= 0) continue;
      char buffer[4096];
      const ssize_t n = ::read(out, buffer, sizeof buffer);
      if (n <= 0) return false;
      seen.append(buffer, static_cast<std::size_t>(n));
    }
    return true;
  }
};

Follower StartFollower(const std::vector<std::string> &args) {
  Follower follower;
  int fds[2];
  if (::pipe(fds) != 0) return follower;
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_adddup2(&actions, fds[1], 1);
  posix_spawn_file_actions_addopen(&actions, 2, "/dev/null", O_WRONLY, 0);
  posix_spawn_file_actions_addclose(&actions, fds[0]);
  posix_spawn_file_actions_addclose(&actions, fds[1]);
  std::vector<std::string> copy = args;
  copy.insert(copy.begin(), "orvane-logcat");
  std::vector<char *> argv;
  for (auto &a : copy) argv.push_back(a.data());
  argv.push_back(nullptr);
  if (posix_spawn(&follower.pid, ORVANE_LOGCAT_PATH, &actions, nullptr, argv.data(), environ) != 0)
    follower.pid = -1;
  posix_spawn_file_actions_destroy(&actions);
  ::close(fds[1]);
  follower.out = fds[0];
  return follower;
}

void Stop(Follower &follower) {
  if (follower.pid > 0) {
    ::kill(follower.pid, SIGTERM);
    int status = 0;
    while (::waitpid(follower.pid, &status, 0) < 0 && errno == EINTR) {
    }
  }
  if (follower.out >= 0) ::close(follower.out);
}

TEST_F(LogcatTest, FollowSeesLinesAppendedLater) {
  // The file does not exist yet when the follower starts.
  Follower follower = StartFollower({"--follow", LogPath("g1")});
  ASSERT_GT(follower.pid, 0);
  Host({"init", "g1", "u1"});
  EXPECT_TRUE(follower.WaitForLines(1)) << follower.seen;
  Host({"special", "g1", "u1", "after\nstart"});
  EXPECT_TRUE(follower.WaitForLines(2)) << follower.seen;
  Host({"exit", "g1", "u1"});
  EXPECT_TRUE(follower.WaitForLines(3)) << follower.seen;
  Stop(follower);
  // Each record once, though the newest line has no line break behind it
  // when it is first read.
  EXPECT_EQ(follower.seen, ExpectedOutput("g1", "g1"));
}

} // namespace
} // namespace orvane::testing
