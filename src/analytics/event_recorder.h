// The event recorder: validates an event, keeps the game's log file starting
// with its INIT line, and appends the event's encrypted line.
#pragma once

#include "core/log_channel.h"
#include "logformat/event_types.h"

#include <array>
#include <cstddef>
#include <cstdint>
#include <iterator>
#include <string_view>

namespace orvane {

// What a call of an event type comes to; each outcome has one message per
// type, "[OrvaneSDK] Analytics <type> - " and the outcome's own text.
enum class Outcome {
  kOk,
  kGameIdEmpty,
  kUserIdEmpty,
  kSdkNotInitialized,
  kOpenFailed, // followed by the game id and ")?"
  kAlreadyInitialized,
  kLogNotInitialized,
  kWriteFailed,
  kLockedOut, // the log was empty and another writer held it
  kEncryptionFailed,
  kTooLarge,
  kInternalError,
};
// Indexed by Outcome.
inline constexpr std::string_view kOutcomeTexts[] = {
    "OK",
    "failed. Game id is empty",
    "failed. User id is empty",
    "SDK was never initialized. Initializing the SDK.",
    "log file failed to open. Maybe a bad game_id (",
    "log had been already initialized.",
    "log was never initialized. Initialized the game log",
    "log file failed to write.",
    "log file is locked by another process.",
    "failed. Record encryption failed.",
    "failed. Record too large.",
    "failed. Internal error.",
};
inline constexpr std::size_t kOutcomeCount = std::size(kOutcomeTexts);
static_assert(kOutcomeCount == static_cast<std::size_t>(Outcome::kInternalError) + 1, "a text per outcome");
// Room for the longest message and its closing zero byte.
inline constexpr std::size_t kEventMessageBytes = 96;

// An event type and every message a call of that type can send, composed at
// compile time so that the event path assembles no message text.
struct EventType {
  EventKind kind;
  std::array<std::array<char, kEventMessageBytes>, kOutcomeCount> messages;
};

inline const char *Message(const EventType &type, Outcome outcome) {
  return type.messages[static_cast<std::size_t>(outcome)].data();
}

extern const EventType kInitEvent;
extern const EventType kEnterEvent;
extern const EventType kExitEvent;
extern const EventType kSpecialEvent;

// Records one event and adds its messages to `messages`. Returns 0 when the
// line is in the file (or an INIT found the log already started), -1 when the
// call was refused or the line could not be written. A null text counts as
// empty. Safe to call from several threads at once: recordings share no
// lock, and every line lands whole.
std::int32_t RecordEvent(MessageBatch &messages, const char *game_id, const char *user_id,
                         const EventType &type, const char *extra);

} // namespace orvane
