// The host log channel: who hears which message, after which registration.
#include "OrvaneSDK.h"
#include "core/log_channel.h"
#include "support/test_support.h"

#include <atomic>
#include <thread>
#include <vector>

namespace orvane::testing {
namespace {

std::string g_heard; // per message: callback, level, first letter of the text
void Hear(char who, LogLevel level, const char *message) {
  g_heard += {who, static_cast<char>('0' + static_cast<int>(level)), message[12]};
}
void ORVANE_CALL HearA(LogLevel level, const char *message) { Hear('A', level, message); }
void ORVANE_CALL HearB(LogLevel level, const char *message) { Hear('B', level, message); }

// Steps: a/b register A/B, 0 registers null, r reports a Warning "note";
// "A0L" is A hearing Info "Logging initiated."
TEST(LogChannel, DeliversToTheRegisteredCallbackOnly) {
  // clang-format off
  const std::pair<const char *, const char *> cases[] = {
      {"ra", "A0L"}, {"ar", "A0LA1n"}, {"a0r", "A0L"}, {"0rar", "A0LA1n"}, {"aa", "A0LA0L"}, {"abr", "A0LB0LB1n"}};
  for (const auto &[steps, heard] : cases) {
    oRegisterForLogs(nullptr);
    g_heard.clear();
    for (const char *step = steps; *step; ++step)
      *step == 'r' ? LogToHost(LogLevel::Warning, "[OrvaneSDK] note")
                   : oRegisterForLogs(*step == 'a' ? HearA : *step == 'b' ? HearB : nullptr);
    EXPECT_EQ(g_heard, heard) << steps;
  }
  // clang-format on
  oRegisterForLogs(nullptr);
}

// Withdrawing a callback waits for its calls on other threads: this one is
// still running when the unregistering thread arrives, and has returned
// when oRegisterForLogs does.
std::atomic<bool> g_inside{false}, g_returned{false};
void ORVANE_CALL Linger(LogLevel, const char *message) {
  if (message[12] != 'n') return;
  g_inside = true;
  std::this_thread::sleep_for(std::chrono::milliseconds(200));
  g_returned = true;
}

TEST(LogChannel, WithdrawingWaitsForCallsOnOtherThreads) {
  oRegisterForLogs(Linger);
  std::thread reporter([] { LogToHost(LogLevel::Info, "[OrvaneSDK] note"); });
  while (!g_inside) std::this_thread::yield();
  oRegisterForLogs(nullptr);
  EXPECT_TRUE(g_returned);
  reporter.join();
}

// A replacement waits only for the deliveries that began before it: two
// threads hand the callback on so that at every moment one is inside it,
// old or new, and the registration still returns.
std::atomic<int> g_entered{0};
std::atomic<bool> g_relaying{true};
void Relay() { // leaves once another delivery has entered after this one
  const int mine = ++g_entered;
  while (g_relaying && g_entered == mine) std::this_thread::yield();
}
void ORVANE_CALL RelayA(LogLevel, const char *) { Relay(); }
void ORVANE_CALL RelayB(LogLevel, const char *) { Relay(); }

TEST(LogChannel, ReplacingWaitsOnlyForEarlierDeliveries) {
  std::vector<std::thread> reporters;
  for (int i = 0; i < 2; ++i)
    reporters.emplace_back([] {
      while (g_relaying) LogToHost(LogLevel::Info, "[OrvaneSDK] note");
    });
  oRegisterForLogs(RelayA);
  while (g_entered < 10) std::this_thread::yield();
  std::atomic<bool> replaced{false};
  std::thread registrar([&replaced] {
    oRegisterForLogs(RelayB);
    replaced = true;
  });
  for (int i = 0; i < 2000 && !replaced; ++i) std::this_thread::sleep_for(std::chrono::milliseconds(10));
  EXPECT_TRUE(replaced) << "still waiting after 20 s for a moment without deliveries";
  g_relaying = false;
  registrar.join();
  for (std::thread &reporter : reporters) reporter.join();
  oRegisterForLogs(nullptr);
}

// A callback that withdraws itself does not wait for its own call (it would
// hang), and hears nothing afterwards.
int g_withdrawn = 0;
void ORVANE_CALL WithdrawSelf(LogLevel, const char *) { ++g_withdrawn, oRegisterForLogs(nullptr); }

TEST(LogChannel, CallbackMayWithdrawItself) {
  oRegisterForLogs(WithdrawSelf);
  LogToHost(LogLevel::Info, "[OrvaneSDK] note");
  EXPECT_EQ(g_withdrawn, 1);
}

} // namespace
} // namespace orvane::testing
