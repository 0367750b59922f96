// The event recorder: validates an event, keeps the game's log file starting
// with its INIT line, and appends the event's encrypted line.
#pragma once

#include "core/log_channel.h"

#include <cstdint>

namespace orvane {

// An event type and every message a call of that type can send, fixed at
// compile time so that the event path assembles no message text.
struct EventType {
  const char *name;
  const char *ok;
  const char *game_id_empty;
  const char *user_id_empty;
  const char *sdk_not_initialized;
  const char *open_failed; // followed by the game id and ")?"
  const char *already_initialized;
  const char *log_not_initialized;
  const char *write_failed;
  const char *locked_out; // the log was empty and another writer held it
  const char *encryption_failed;
  const char *too_large;
  const char *internal_error;
};

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
