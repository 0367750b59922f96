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
Result RunExport(Result failure, const char *failure_message, Work &&work) noexcept {
  const platform::CancellationOff uncancellable;
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

} // namespace orvane
