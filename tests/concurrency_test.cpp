// Threads of one process and several processes recording into the same logs
// at once: no line lost, torn or glued, and one INIT line first in each log.
#include "OrvaneSDK.h"
#include "analytics/record_cipher.h"
#include "support/test_support.h"

#include <atomic>
#include <filesystem>
#include <set>
#include <thread>

namespace orvane::testing {
namespace {

void ORVANE_CALL Ignore(LogLevel, const char *) {}

class ConcurrencyTest : public SandboxTest {
protected:
  void SetUp() override {
    SandboxTest::SetUp();
    oRegisterForLogs(Ignore); // heard from every thread: nothing to share
  }
  // The log's records, each under the first key that opens it.
  std::vector<std::string> Log(const std::string &game, const std::vector<std::string> &keys) {
    std::vector<std::string> merged;
    for (const std::string &key : keys) {
      const std::vector<std::string> records = Records(LogPath(game), key);
      merged.resize(records.size(), "(undecryptable)");
      for (std::size_t i = 0; i < records.size(); ++i)
        if (records[i] != "(undecryptable)") merged[i] = records[i];
    }
    return merged;
  }
  std::string ProcessKey() {
    const KeyBlock &block = GetKeyBlock();
    return std::string(block.keyText.begin(), block.keyText.end());
  }
};

std::string Tag(char kind, int who, int i) {
  std::string tag(1, kind);
  tag.append(std::to_string(who)).append(1, 'e').append(std::to_string(i));
  return tag;
}

std::string Field(const std::string &record, const std::string &name) {
  const std::size_t start = record.find(std::string(1, '"').append(name).append("\":\"")) + name.size() + 4;
  return record.substr(start, record.find('"', start) - start);
}

// Processes and threads record at once, threads on logs of their own and all
// on one log together, while the callback changes under them: each log
// starts with its one INIT line and loses no event.
TEST_F(ConcurrencyTest, ThreadsAndProcessesShareLogs) {
  constexpr int kThreads = 4, kProcesses = 2, kEvents = 80;
  std::multiset<std::string> expected, extras;
  std::vector<std::thread> running;
  for (int p = 0; p < kProcesses; ++p) {
    std::vector<std::string> calls = {"orvane-host", "--library", ORVANE_LIBRARY_PATH, "register-null"};
    for (int i = 0; i < kEvents; ++i) calls.insert(calls.end(), {"special", "shared", "u1", Tag('p', p, i)});
    for (int i = 0; i < kEvents; ++i) expected.insert(Tag('p', p, i));
    running.emplace_back([this, calls] {
      EXPECT_EQ(RunChild(ORVANE_HOST_PATH, calls, {{"XDG_DATA_HOME", where_.base}}).exit_code, 0);
    });
  }
  for (int t = 0; t < kThreads; ++t) {
    for (int i = 0; i < kEvents; i += 2) expected.insert(Tag('t', t, i));
    running.emplace_back([t] {
      for (int i = 0; i < kEvents; ++i)
        EXPECT_EQ(oAnalyticsSpecial(i % 2 ? ("own-" + std::to_string(t)).c_str() : "shared", "u1",
                                    Tag('t', t, i).c_str()),
                  0);
    });
  }
  std::atomic<bool> done{false};
  std::thread registrar([&done] {
    while (!done) oRegisterForLogs(Ignore), oRegisterForLogs(nullptr);
  });
  for (std::thread &thread : running) thread.join();
  done = true;
  registrar.join();
  for (int t = 0; t <= kThreads; ++t) {
    const std::string game = t < kThreads ? "own-" + std::to_string(t) : "shared";
    const std::vector<std::string> records = Log(game, {ProcessKey(), KeyTextFor("shared")});
    ASSERT_EQ(records.size(), 1u + (t < kThreads ? kEvents / 2 : expected.size())) << game;
    EXPECT_EQ(Field(records[0], "type"), "INIT") << game;
    for (std::size_t i = 1; i < records.size() && t == kThreads; ++i)
      extras.insert(Field(records[i], "extra"));
  }
  EXPECT_EQ(extras, expected);
}

} // namespace
} // namespace orvane::testing
