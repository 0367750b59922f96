// The host log channel: who hears which message, after which registration.
#include "OrvaneSDK.h"
#include "core/log_channel.h"
#include "support/test_support.h"

#include <atomic>
#include <stdexcept>
#include <thread>

namespace orvane::testing {
namespace {

std::vector<std::string> g_heard; // who heard it, the level (0 Info, 1 Warning), the text
void Hear(const char *who, LogLevel level, const char *message) {
  g_heard.push_back(who + std::to_string(static_cast<int>(level)) + " " + message);
}
void ORVANE_CALL HearA(LogLevel level, const char *message) { Hear("A", level, message); }
void ORVANE_CALL HearB(LogLevel level, const char *message) { Hear("B", level, message); }
// A C++ host's exception must not unwind through the game's C frames: it
// stops at the library.
void ORVANE_CALL HearAndThrow(LogLevel level, const char *message) {
  Hear("T", level, message);
  throw std::runtime_error("host");
}
// A callback that withdraws itself must not wait for its own call: it would hang.
void ORVANE_CALL HearAndWithdraw(LogLevel level, const char *message) {
  Hear("W", level, message);
  oRegisterForLogs(nullptr);
}
template <LogCallback callback>
void Register() {
  oRegisterForLogs(callback);
}
void Report() { LogToHost(LogLevel::Warning, "[OrvaneSDK] note"); }

TEST(LogChannel, DeliversToTheRegisteredCallbackOnly) {
  const auto greeting = [](const char *who) { return who + std::string("0 [OrvaneSDK] Logging initiated."); };
  const auto note = [](const char *who) { return who + std::string("1 [OrvaneSDK] note"); };
  const struct {
    const char *name;
    std::vector<void (*)()> steps;
    std::vector<std::string> heard;
  } cases[] = {
      {"heard only while registered", {Report, Register<HearA>, Register<nullptr>, Report}, {greeting("A")}},
      {"greeted at every registration; replaced",
       {Register<HearA>, Register<HearA>, Register<HearB>, Report},
       {greeting("A"), greeting("A"), greeting("B"), note("B")}},
      {"one that throws hears the next", {Register<HearAndThrow>, Report}, {greeting("T"), note("T")}},
      {"one that withdraws itself", {Register<HearAndWithdraw>, Report}, {greeting("W")}},
  };
  for (const auto &c : cases) {
    oRegisterForLogs(nullptr);
    g_heard.clear();
    for (void (*step)() : c.steps) step();
    EXPECT_EQ(g_heard, c.heard) << c.name;
  }
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
}

} // namespace
} // namespace orvane::testing
