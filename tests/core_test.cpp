// Core services: the host log channel (who hears which message, after which
// registration) and the storage directories.
#include "OrvaneSDK.h"
#include "core/log_channel.h"
#include "core/storage.h"
#include "support/test_support.h"

#include <atomic>
#include <chrono>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

namespace orvane::testing {
namespace {

std::vector<std::string> g_heard_a, g_heard_b;
void ORVANE_CALL HearA(LogLevel, const char *message) { g_heard_a.push_back(message); }
void ORVANE_CALL HearB(LogLevel, const char *message) { g_heard_b.push_back(message); }

enum class Step { RegisterA, RegisterB, RegisterNull, Report };

struct ChannelCase {
  const char *name;
  std::vector<Step> steps;
  std::vector<std::string> heard_a;
  std::vector<std::string> heard_b;
};

constexpr const char *kHello = "[OrvaneSDK] Logging initiated.";
constexpr const char *kNote = "[OrvaneSDK] note";

TEST(LogChannel, DeliversToTheRegisteredCallbackOnly) {
  const ChannelCase cases[] = {
      {"lost before registration, not replayed", {Step::Report, Step::RegisterA}, {kHello}, {}},
      {"delivered after registration", {Step::RegisterA, Step::Report}, {kHello, kNote}, {}},
      {"null silences", {Step::RegisterA, Step::RegisterNull, Step::Report}, {kHello}, {}},
      {"null then a callback restores delivery",
       {Step::RegisterNull, Step::Report, Step::RegisterA, Step::Report},
       {kHello, kNote},
       {}},
      {"same callback twice is greeted twice", {Step::RegisterA, Step::RegisterA}, {kHello, kHello}, {}},
      {"B replaces A", {Step::RegisterA, Step::RegisterB, Step::Report}, {kHello}, {kHello, kNote}},
  };
  for (const ChannelCase &c : cases) {
    SCOPED_TRACE(c.name);
    oRegisterForLogs(nullptr);
    g_heard_a.clear();
    g_heard_b.clear();
    for (Step step : c.steps) {
      switch (step) {
      case Step::RegisterA: oRegisterForLogs(HearA); break;
      case Step::RegisterB: oRegisterForLogs(HearB); break;
      case Step::RegisterNull: oRegisterForLogs(nullptr); break;
      case Step::Report: LogToHost(LogLevel::Warning, kNote); break;
      }
    }
    EXPECT_EQ(g_heard_a, c.heard_a);
    EXPECT_EQ(g_heard_b, c.heard_b);
  }
  oRegisterForLogs(nullptr);
}

// A batch holds its messages back until Deliver and keeps their order and
// levels, also for texts assembled at run time.
TEST(LogChannel, BatchDeliversInOrderAfterTheWork) {
  Captured().clear();
  oRegisterForLogs(CaptureMessage);
  Captured().clear();
  {
    MessageBatch batch;
    batch.Add(LogLevel::Info, "[OrvaneSDK] one");
    batch.AddOwned(LogLevel::Error, std::string("[OrvaneSDK] two ") + "(assembled)");
    batch.Add(LogLevel::Warning, "[OrvaneSDK] three");
    EXPECT_TRUE(Captured().empty());
    batch.Deliver();
    batch.Deliver(); // nothing is sent twice
  }
  const std::vector<Message> expected = {{0, "[OrvaneSDK] one"},
                                         {2, "[OrvaneSDK] two (assembled)"},
                                         {1, "[OrvaneSDK] three"}};
  EXPECT_EQ(Captured(), expected);
  oRegisterForLogs(nullptr);
}

// Withdrawing a callback waits for its calls on other threads: this one is
// still running when the unregistering thread arrives, and has returned
// when oRegisterForLogs does.
std::atomic<bool> g_inside{false}, g_returned{false};
void ORVANE_CALL Linger(LogLevel, const char *message) {
  if (std::string(message) != kNote) return;
  g_inside = true;
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
  g_returned = true;
}

TEST(LogChannel, WithdrawingWaitsForCallsOnOtherThreads) {
  oRegisterForLogs(Linger);
  std::thread reporter([] { LogToHost(LogLevel::Info, kNote); });
  while (!g_inside) std::this_thread::yield();
  oRegisterForLogs(nullptr);
  EXPECT_TRUE(g_returned);
  reporter.join();
}

// A callback that withdraws itself does not wait for its own call (it would
// hang), and hears nothing afterwards.
int g_withdrawn = 0;
void ORVANE_CALL WithdrawSelf(LogLevel, const char *) {
  ++g_withdrawn;
  oRegisterForLogs(nullptr);
}

TEST(LogChannel, CallbackMayWithdrawItself) {
  oRegisterForLogs(WithdrawSelf);
  LogToHost(LogLevel::Info, kNote);
  EXPECT_EQ(g_withdrawn, 1);
}

// oInitialize creates what is missing, the root before the logs, and says
// what the disk shows afterwards.
std::vector<std::string> g_created;
bool RecordingMakeDirectory(const char *path) {
  g_created.push_back(path);
  return platform::native_calls().make_directory(path);
}

TEST_F(SandboxTest, InitializeCreatesWhatIsMissingRootFirst) {
  platform::calls().make_directory = RecordingMakeDirectory;
  const Message ok{0, "[OrvaneSDK] Initialize() - OK."}, failed{2, "[OrvaneSDK] Initialize() - failed."};
  const std::string root = where_.root, logs = where_.logs;
  const struct {
    std::vector<std::string> before, created;
    Message message;
  } cases[] = {
      {{}, {root, logs}, ok}, {{root}, {logs}, ok}, {{logs}, {}, ok}, {{root, "file"}, {logs}, failed}};
  for (const auto &c : cases) {
    RemoveTree(where_.base);
    for (const std::string &dir : c.before)
      dir == "file" ? WriteFile(root + "Logs", "in the way") : (void)std::filesystem::create_directories(dir);
    g_created.clear();
    Captured().clear();
    oInitialize();
    EXPECT_EQ(g_created, c.created);
    EXPECT_EQ(Captured(), std::vector<Message>{c.message});
  }
}

} // namespace
} // namespace orvane::testing
