// The host log channel: who hears which message, after which registration.
#include "OrvaneSDK.h"
#include "core/log_channel.h"
#include "support/test_support.h"

#include <atomic>
#include <thread>

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

// A registration waits for the other threads' deliveries that began before it
// and only for those: two threads keep one inside the callback at every
// moment, yet a replacement returns, with none left in the old one.
std::atomic<int> g_entered{0}, g_inside_a{0};
std::atomic<bool> g_relaying{true};
void Relay() { // leaves once another delivery has entered after this one
  const int mine = ++g_entered;
  while (g_relaying && g_entered == mine) std::this_thread::yield();
}
void ORVANE_CALL RelayA(LogLevel, const char *) {
  ++g_inside_a;
  Relay();
  --g_inside_a;
}
void ORVANE_CALL RelayB(LogLevel, const char *) { Relay(); }

TEST(LogChannel, ReplacingWaitsOnlyForEarlierDeliveries) {
  const auto report = [] {
    while (g_relaying) LogToHost(LogLevel::Info, "[OrvaneSDK] note");
  };
  std::thread first(report), second(report);
  oRegisterForLogs(RelayA);
  while (g_entered < 10) std::this_thread::yield();
  oRegisterForLogs(RelayB); // before: waited for a moment without deliveries, which never came
  EXPECT_EQ(g_inside_a, 0);
  g_relaying = false;
  for (std::thread *reporter : {&first, &second}) reporter->join();
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
