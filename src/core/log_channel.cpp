#include "core/log_channel.h"

#include "platform/platform.h"

#include <atomic>
#include <chrono>
#include <thread>

namespace orvane {
namespace {

// Registering on one thread while another reports is safe: the callback is
// one atomic pointer, constant-initialised, so it exists before any call.
std::atomic<LogCallback> g_callback{nullptr};
// Deliveries under way on every thread, in two tallies, each delivery
// counted in one from before it loads the callback until the callback has
// returned. New deliveries go to the tally that g_entry names. A
// registration turns them away from one tally and waits until it has drained
// (to its own thread's share), then does the same with the other: so it
// waits only for deliveries that began before it, however steadily other
// threads report, and a host may free its old callback (or unload the code
// behind it) as soon as it returns.
std::atomic<int> g_deliveries[2] = {0, 0};
std::atomic<unsigned> g_entry{0};
// This thread's share of each tally: a callback that registers waits for the
// other threads, never for the deliveries it is itself running in.
thread_local int t_deliveries[2] = {0, 0};

// Polls, since registrations are rare and deliveries must not pay for a
// wake-up; the sleep keeps a long callback from costing a whole core. Any
// moment at which a tally stands at this thread's share proves that every
// delivery counted in it before has ended, so two registrations turning the
// entry at once delay each other but never mislead each other.
void WaitForEarlierDeliveries() noexcept {
  for (unsigned tally : {0u, 1u}) {
    g_entry.store(1 - tally, std::memory_order_seq_cst);
    for (int round = 0; g_deliveries[tally].load(std::memory_order_seq_cst) != t_deliveries[tally]; ++round) {
      if (round < 100)
        std::this_thread::yield();
      else
        std::this_thread::sleep_for(std::chrono::microseconds(200));
    }
  }
}

// A forked child has only the thread that forked: deliveries of the parent's
// other threads will never end in it.
void ForgetOtherThreadsDeliveries() {
  for (unsigned tally : {0u, 1u}) g_deliveries[tally].store(t_deliveries[tally], std::memory_order_relaxed);
}

} // namespace

void LogToHost(LogLevel level, const char *message) noexcept {
  // Without a callback a message costs one load and is dropped.
  if (g_callback.load(std::memory_order_relaxed) == nullptr) return;
  // Counted first, then loaded: a registration stores its callback first,
  // then reads the tallies (all sequentially consistent). So either it sees
  // this delivery and waits for it, or this load already sees its callback.
  const unsigned tally = g_entry.load(std::memory_order_relaxed) & 1;
  g_deliveries[tally].fetch_add(1, std::memory_order_seq_cst);
  ++t_deliveries[tally];
  const LogCallback callback = g_callback.load(std::memory_order_seq_cst);
  if (callback != nullptr) {
    try {
      callback(level, message);
    } catch (...) {
      // A C++ host's exception must not unwind through C frames of the game.
    }
  }
  --t_deliveries[tally];
  // Release: what the callback did is visible to the registration that
  // waited for it.
  g_deliveries[tally].fetch_sub(1, std::memory_order_release);
}

void RegisterForLogs(LogCallback callback) noexcept {
  // Before the first registration no delivery can be under way, so this is
  // early enough for every fork that could inherit one.
  static const bool fork_handled = [] {
    platform::RunInForkedChildren(ForgetOtherThreadsDeliveries);
    return true;
  }();
  static_cast<void>(fork_handled);
  g_callback.store(callback, std::memory_order_seq_cst);
  WaitForEarlierDeliveries();
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
