#include "core/log_channel.h"

#include <atomic>
#include <chrono>
#include <thread>

namespace orvane {
namespace {

// Registering on one thread while another reports is safe: the callback is
// one atomic pointer, constant-initialised, so it exists before any call.
std::atomic<LogCallback> g_callback{nullptr};
// Deliveries under way on every thread, each counted from before it loads
// the callback until the callback has returned. A registration waits for
// this count to drop to its own thread's share, so that a host may free its
// old callback (or unload the code behind it) as soon as it returns.
std::atomic<int> g_deliveries{0};
// This thread's share of g_deliveries: a callback that registers waits for
// the other threads, never for the deliveries it is itself running in.
thread_local int t_deliveries = 0;

// Ends at the first moment when no other thread is inside a delivery. That
// covers the old callback's calls and, when one callback replaces another,
// the new one's too: a steady stream of messages from other threads delays
// a replacement until a gap between them, while withdrawing (null) waits
// only for the calls already under way. Polls, since registrations are
// rare and deliveries must not pay for a wake-up; the sleep keeps a long
// callback from costing a whole core.
void WaitForOtherDeliveries() noexcept {
  for (int round = 0; g_deliveries.load(std::memory_order_seq_cst) != t_deliveries; ++round) {
    if (round < 100)
      std::this_thread::yield();
    else
      std::this_thread::sleep_for(std::chrono::microseconds(200));
  }
}

} // namespace

void LogToHost(LogLevel level, const char *message) noexcept {
  // Without a callback a message costs one load and is dropped.
  if (g_callback.load(std::memory_order_relaxed) == nullptr) return;
  // Counted first, then loaded: a registration stores its callback first,
  // then reads the count (both sequentially consistent). So either it sees
  // this delivery and waits for it, or this load already sees its callback.
  g_deliveries.fetch_add(1, std::memory_order_seq_cst);
  ++t_deliveries;
  const LogCallback callback = g_callback.load(std::memory_order_seq_cst);
  if (callback != nullptr) {
    try {
      callback(level, message);
    } catch (...) {
      // A C++ host's exception must not unwind through C frames of the game.
    }
  }
  --t_deliveries;
  // Release: what the callback did is visible to the registration that
  // waited for it.
  g_deliveries.fetch_sub(1, std::memory_order_release);
}

void RegisterForLogs(LogCallback callback) noexcept {
  g_callback.store(callback, std::memory_order_seq_cst);
  WaitForOtherDeliveries();
  if (callback != nullptr) LogToHost(LogLevel::Info, "[OrvaneSDK] Logging initiated.");
}

void MessageBatch::Add(LogLevel level, const char *text) noexcept {
  if (count == kCapacity) return;
  entries[count].level = level;
  entries[count].text = text;
  ++count;
}

void MessageBatch::AddOwned(LogLevel level, std::string text) {
  if (count == kCapacity) return;
  owned.push_front(std::move(text));
  entries[count].level = level;
  entries[count].text = owned.front().c_str();
  ++count;
}

void MessageBatch::Deliver() noexcept {
  for (std::size_t i = 0; i < count; ++i) LogToHost(entries[i].level, entries[i].text);
  owned.clear();
  count = 0;
}

} // namespace orvane
