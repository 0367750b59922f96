// Threads of one process and several processes recording into the same logs
// at once: no line lost, torn or interleaved, and one INIT line per log.
#include "OrvaneSDK.h"
#include "analytics/record_cipher.h"
#include "core/storage.h"
#include "support/child_process.h"
#include "support/test_support.h"

#include <atomic>
#include <chrono>
#include <filesystem>
#include <map>
#include <set>
#include <thread>

namespace orvane::testing {
namespace {

class ConcurrencyTest : public SandboxTest {
protected:
  void SetUp() override {
    SandboxTest::SetUp();
    std::filesystem::create_directories(where_.logs);
    RegisterForLogs(CountMessage);
    g_ok = 0;
    g_other = 0;
  }
  // A child host that records into the same directory as this process.
  std::thread StartHost(std::vector<std::string> calls, ChildResult &result) {
    calls.insert(calls.begin(), {"orvane-host", "--library", ORVANE_LIBRARY_PATH, "register-null"});
    return std::thread([this, calls, &result] {
      result = RunChild(ORVANE_HOST_PATH, calls, {{"XDG_DATA_HOME", where_.base}}, 120);
    });
  }
  // Decrypts every line under one of `keys`; "" marks a line none opens.
  std::vector<std::string> Plain(const std::string &game_id, const std::vector<std::string> &keys) {
    std::vector<std::string> plain;
    for (const std::string &line : SplitLines(ReadFile(LogPath(game_id)).value_or(""))) {
      std::optional<std::string> text;
      for (const std::string &key : keys)
        if (!text) text = DecryptLine(line, key);
      plain.push_back(text.value_or(""));
    }
    return plain;
  }
  static void ORVANE_CALL CountMessage(LogLevel level, const char *message) {
    const std::string_view text(message);
    (level == LogLevel::Info && text.ends_with(" - OK") ? g_ok : g_other)++;
  }
  static std::atomic<int> g_ok, g_other;
};
std::atomic<int> ConcurrencyTest::g_ok, ConcurrencyTest::g_other;

std::string ExtraOf(const std::string &record) {
  const std::size_t start = record.find("\"extra\":\"");
  if (start == std::string::npos) return "(no extra)";
  return record.substr(start + 9, record.size() - start - 9 - 2);
}

TEST_F(ConcurrencyTest, ThreadsAndProcessesShareOneLog) {
  constexpr int kThreads = 8, kProcesses = 4, kEvents = 150;
  std::set<std::string> expected_extras;
  std::vector<ChildResult> children(kProcesses);
  std::vector<std::thread> running;
  for (int p = 0; p < kProcesses; ++p) {
    std::vector<std::string> calls;
    for (int i = 0; i < kEvents; ++i) {
      const std::string extra = "process " + std::to_string(p) + " event " + std::to_string(i);
      calls.insert(calls.end(), {"special", "shared", "u1", extra});
      expected_extras.insert(extra);
    }
    running.push_back(StartHost(calls, children[p]));
  }
  for (int t = 0; t < kThreads; ++t) {
    for (int i = 0; i < kEvents; ++i) expected_extras.insert("thread " + std::to_string(t) + " event " + std::to_string(i));
    running.emplace_back([t] {
      for (int i = 0; i < kEvents; ++i) {
        const std::string extra = "thread " + std::to_string(t) + " event " + std::to_string(i);
        oAnalyticsSpecial("shared", "u1", extra.c_str());
      }
    });
  }
  for (std::thread &thread : running) thread.join();
  for (const ChildResult &child : children) EXPECT_EQ(child.exit_code, 0) << child.output;

  const KeyBlock &block = GetKeyBlock();
  const std::vector<std::string> plain =
      Plain("shared", {std::string(block.keyText.begin(), block.keyText.end()), KeyTextFor("shared")});
  ASSERT_EQ(plain.size(), 1u + (kThreads + kProcesses) * kEvents);
  EXPECT_NE(plain[0].find("\"type\":\"INIT\""), std::string::npos) << plain[0];
  std::multiset<std::string> extras;
  for (std::size_t i = 1; i < plain.size(); ++i) {
    ASSERT_FALSE(plain[i].empty()) << "line " << i + 1 << " does not decrypt";
    EXPECT_EQ(plain[i].find("\"type\":\"INIT\""), std::string::npos) << "line " << i + 1;
    extras.insert(ExtraOf(plain[i]));
  }
  EXPECT_EQ(extras, std::multiset<std::string>(expected_extras.begin(), expected_extras.end()));
  // Every in-process call said OK on its own thread; the first one also
  // reported its nested INIT run when it found the log empty.
  EXPECT_GE(g_ok.load(), kThreads * kEvents);
  EXPECT_LE(g_ok.load(), kThreads * kEvents + 1);
}

// Threads of one process share no lock: on logs of their own and on one log
// together, each log still starts with one INIT line and loses nothing,
// while the callback changes under them.
TEST_F(ConcurrencyTest, ThreadsOnOwnAndSharedLogsWhileTheCallbackChanges) {
  constexpr int kThreads = 4, kEvents = 60;
  std::atomic<bool> done{false};
  std::thread registrar([&] {
    while (!done) {
      oRegisterForLogs(CountMessage);
      oRegisterForLogs(nullptr);
    }
  });
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t)
    threads.emplace_back([t] {
      const std::string own = "own-" + std::to_string(t);
      for (int i = 0; i < kEvents; ++i) EXPECT_EQ(oAnalyticsGameEnter(i % 2 ? "together" : own.c_str(), "u1"), 0);
    });
  for (std::thread &thread : threads) thread.join();
  done = true;
  registrar.join();
  const KeyBlock &block = GetKeyBlock();
  const std::vector<std::string> keys = {std::string(block.keyText.begin(), block.keyText.end())};
  for (int t = 0; t <= kThreads; ++t) {
    const std::string game = t < kThreads ? "own-" + std::to_string(t) : "together";
    const std::vector<std::string> plain = Plain(game, keys);
    ASSERT_EQ(plain.size(), 1u + (t < kThreads ? kEvents / 2 : kThreads * kEvents / 2)) << game;
    for (std::size_t i = 0; i < plain.size(); ++i)
      EXPECT_EQ(plain[i].find(i == 0 ? "\"type\":\"INIT\"" : "\"type\":\"ENTER\""), 29u + game.size()) << game << i;
  }
}

// Several processes that record the first event of a new game at once: the
// log starts with exactly one INIT line however they interleave.
TEST_F(ConcurrencyTest, OneInitLinePerLogAcrossProcesses) {
  constexpr int kRounds = 40, kProcesses = 4;
  const std::string go = base_ + "/go";
  std::vector<std::string> calls = {"wait-for", go};
  for (int round = 0; round < kRounds; ++round)
    calls.insert(calls.end(), {"enter", "race-" + std::to_string(round), "u1"});
  std::vector<ChildResult> children(kProcesses);
  std::vector<std::thread> running;
  for (int p = 0; p < kProcesses; ++p) running.push_back(StartHost(calls, children[p]));
  std::this_thread::sleep_for(std::chrono::milliseconds(300)); // every host loaded and waiting
  WriteFile(go, "go");
  for (std::thread &thread : running) thread.join();
  for (const ChildResult &child : children) EXPECT_EQ(child.exit_code, 0) << child.output;

  for (int round = 0; round < kRounds; ++round) {
    const std::string game = "race-" + std::to_string(round);
    std::map<std::string, int> types;
    const std::vector<std::string> plain = Plain(game, {KeyTextFor("race-0")});
    for (const std::string &record : plain) {
      const std::size_t at = record.find("\"type\":\"");
      types[at == std::string::npos ? "(bad)" : record.substr(at + 8, record.find('"', at + 8) - at - 8)]++;
    }
    EXPECT_EQ(types, (std::map<std::string, int>{{"ENTER", kProcesses}, {"INIT", 1}})) << game;
    ASSERT_FALSE(plain.empty());
    EXPECT_NE(plain[0].find("\"type\":\"INIT\""), std::string::npos) << game;
  }
}

} // namespace
} // namespace orvane::testing
