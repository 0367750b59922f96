// The frame of every exported function: collect the call's messages, keep
// every C++ exception inside the library, then deliver the messages.
#pragma once

#include "core/log_channel.h"
#include "platform/platform.h"

#include <utility>

namespace orvane {

// Runs `work(messages)` and returns its result. When it throws (memory
// exhausted, say), the call reports `failure_message` at Error level and
// returns `failure` instead: no exception ever reaches the host.
template <class Result, class Work>
Result RunCatching(Result failure, const char *failure_message, Work &&work) noexcept {
  MessageBatch messages;
  Result result = failure;
  try {
    result = std::forward<Work>(work)(messages);
  } catch (...) {
    result = failure;
    messages.Add(LogLevel::Error, failure_message);
  }
  messages.Deliver();
  return result;
}

// The same with the thread kept from being cancelled meanwhile. Not noexcept,
// nor are the exports that call it: an asynchronous cancellation that arrived
// during the call acts when the caller's setting comes back, and unwinds the
// thread through these frames to the game's.
template <class Result, class Work>
Result RunExport(Result failure, const char *failure_message, Work &&work) {
  const int cancellation = platform::DisableCancellation();
  const Result result = RunCatching(failure, failure_message, std::forward<Work>(work));
  platform::RestoreCancellation(cancellation);
  return result;
}

} // namespace orvane
