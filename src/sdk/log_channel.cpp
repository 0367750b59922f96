#include "sdk/log_channel.h"

#include <atomic>

namespace orvane {
namespace {

// Registering on one thread while another reports is safe: the callback is
// one atomic pointer, constant-initialised, so it exists before any call.
std::atomic<LogCallback> g_callback{nullptr};

} // namespace

void LogToHost(LogLevel level, const char *message) noexcept {
  LogCallback callback = g_callback.load(std::memory_order_acquire);
  if (callback == nullptr) return;
  try {
    callback(level, message);
  } catch (...) {
    // A C++ host's exception must not unwind through C frames of the game.
  }
}

void RegisterForLogs(LogCallback callback) noexcept {
  g_callback.store(callback, std::memory_order_release);
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
