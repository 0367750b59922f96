// The host log channel: the one registered callback and the messages that a
// call of the library sends to it.
#pragma once

#include "OrvaneSDK.h"

#include <array>
#include <cstddef>
#include <forward_list>
#include <string>

namespace orvane {

// Delivers (level, message) to the registered callback, or drops it when
// none is registered.
void LogToHost(LogLevel level, const char *message) noexcept;

// Replaces the registered callback and returns once no other thread is
// still running the previous one; a non-null one is then greeted. A call
// from inside a callback does not wait for the delivery it runs in.
void RegisterForLogs(LogCallback callback) noexcept;

// The messages of one exported call, in the order they arose. They go to the
// host only when the call has finished its work and released every lock, so
// a callback that blocks or calls back into the library cannot deadlock it.
struct MessageBatch {
  struct Entry {
    LogLevel level;
    const char *text; // a constant text, or one of `owned`
  };
  // More than any call ever sends: a first event on a new machine sends five.
  static constexpr std::size_t kCapacity = 8;
  // Only the first `count` entries are set: every exported call makes a
  // batch, so one must cost next to nothing to make and to drop.
  std::array<Entry, kCapacity> entries;
  std::size_t count = 0;
  // Texts assembled at run time (rare: failures only). List nodes never
  // move, so entries can point into them.
  std::forward_list<std::string> owned;

  // `text` must outlive the batch (a literal).
  void Add(LogLevel level, const char *text) noexcept;
  void AddOwned(LogLevel level, std::string text);
  // Sends every message through LogToHost, in order, and empties the batch.
  void Deliver() noexcept;
};

} // namespace orvane
