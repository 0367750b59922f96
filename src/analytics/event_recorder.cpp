#include "analytics/event_recorder.h"

#include "analytics/game_id.h"
#include "analytics/record_cipher.h"
#include "analytics/record_text.h"
#include "analytics/timestamp.h"
#include "platform/platform.h"
#include "sdk/storage.h"

#include <mutex>
#include <string>
#include <string_view>

namespace orvane {

#define ORVANE_EVENT_TYPE(TYPE, EXTRA)                                                        \
  {                                                                                           \
    TYPE, EXTRA, "[OrvaneSDK] Analytics " TYPE " - OK",                                       \
        "[OrvaneSDK] Analytics " TYPE " - failed. Game id is empty",                          \
        "[OrvaneSDK] Analytics " TYPE " - failed. User id is empty",                          \
        "[OrvaneSDK] Analytics " TYPE " - SDK was never initialized. Initializing the SDK.",  \
        "[OrvaneSDK] Analytics " TYPE " - log file failed to open. Maybe a bad game_id (",    \
        "[OrvaneSDK] Analytics " TYPE " - log had been already initialized.",                 \
        "[OrvaneSDK] Analytics " TYPE " - log was never initialized. Initialized the game log", \
        "[OrvaneSDK] Analytics " TYPE " - log file failed to write.",                         \
        "[OrvaneSDK] Analytics " TYPE " - failed. Record encryption failed.",                 \
        "[OrvaneSDK] Analytics " TYPE " - failed. Internal error."                            \
  }

const EventType kInitEvent = ORVANE_EVENT_TYPE("INIT", false);
const EventType kEnterEvent = ORVANE_EVENT_TYPE("ENTER", false);
const EventType kExitEvent = ORVANE_EVENT_TYPE("EXIT", false);
const EventType kSpecialEvent = ORVANE_EVENT_TYPE("SPECIAL", true);

#undef ORVANE_EVENT_TYPE

namespace {

// One recording at a time in the process. The buffers live on across events
// so that an event allocates nothing once they have grown; they are never in
// use while a nested INIT run uses them, since that run ends before the outer
// run composes its own line.
struct Recorder {
  std::mutex lock;
  std::string path;
  std::string record;
  std::string line;
  TimestampCache clock;
};
Recorder g_recorder;

std::string_view Text(const char *text) { return text ? std::string_view(text) : std::string_view(); }

struct Event {
  std::string_view game_id;
  std::string_view user_id;
  const EventType &type;
  std::string_view extra;
};

// Opens the game's log. The directory is examined only when the open fails,
// which spares the common event a system call and sends the host the same
// messages in the same order as examining it first.
platform::FileHandle OpenLog(MessageBatch &messages, const Event &event, const std::string &path) {
  const platform::Calls &os = platform::calls();
  const std::string &logs = Storage().logs;
  const bool usable = IsUsableGameId(event.game_id) && !logs.empty();
  platform::FileHandle file = usable ? os.open_append(path.c_str()) : platform::kNoFile;
  if (file == platform::kNoFile) {
    if (!DirectoryExists(logs.c_str())) {
      messages.Add(LogLevel::Info, event.type.sdk_not_initialized);
      InitializeStorage(messages);
      if (usable) file = os.open_append(path.c_str());
    }
    if (file == platform::kNoFile) {
      std::string text = event.type.open_failed;
      text += event.game_id;
      text += ")?";
      messages.AddOwned(LogLevel::Error, std::move(text));
    }
  }
  return file;
}

// The body of a recording, with the recorder lock held. `nested` marks the
// INIT run that a first event makes while its own handle is open.
std::int32_t RecordLocked(MessageBatch &messages, const Event &event, const std::string &path,
                          bool nested) {
  const platform::Calls &os = platform::calls();
  const EventType &type = event.type;
  const platform::FileHandle file = OpenLog(messages, event, path);
  if (file == platform::kNoFile) return -1;

  // An empty log is the one moment two processes could both write an INIT
  // line, so only then is the file locked and measured again. The nested run
  // needs no lock: its outer run holds it.
  std::int64_t size = os.file_size(file);
  bool locked = false;
  if (size == 0 && !nested) {
    locked = os.lock_file(file);
    if (locked) size = os.file_size(file);
  }
  auto finish = [&](bool wrote_ok) {
    if (locked) os.unlock_file(file);
    return os.close_file(file) && wrote_ok;
  };

  Recorder &r = g_recorder;
  r.line.clear();
  if (&type == &kInitEvent) {
    if (size != 0) {
      messages.Add(LogLevel::Warning, type.already_initialized);
      finish(true);
      return 0;
    }
  } else {
    if (size == 0) {
      messages.Add(LogLevel::Warning, type.log_not_initialized);
      // Its outcome is its own: a failed INIT line is reported by the nested
      // run, and this event is still written.
      RecordLocked(messages, Event{event.game_id, event.user_id, kInitEvent, {}}, path, true);
    }
    r.line = platform::line_break();
  }

  r.record.clear();
  AppendEventRecord(r.record, event.game_id, event.user_id, type.name, r.clock.Now(),
                    type.carries_extra ? event.extra : std::string_view());
  if (!EncryptRecordText(r.record, r.line)) {
    messages.Add(LogLevel::Error, type.encryption_failed);
    finish(true);
    return -1;
  }
  // The line break and the line go in one write, so that a concurrent writer
  // can never land between them.
  const bool appended = os.append(file, r.line.data(), r.line.size());
  if (!finish(appended)) {
    messages.Add(LogLevel::Error, type.write_failed);
    return -1;
  }
  messages.Add(LogLevel::Info, type.ok);
  return 0;
}

} // namespace

std::int32_t RecordEvent(MessageBatch &messages, const char *game_id, const char *user_id,
                         const EventType &type, const char *extra) {
  // The first event of the process fixes the key text, whatever its outcome.
  TakeKeyText(game_id);
  const Event event{Text(game_id), Text(user_id), type, Text(extra)};
  if (event.game_id.empty()) {
    messages.Add(LogLevel::Error, type.game_id_empty);
    return -1;
  }
  if (event.user_id.empty()) {
    messages.Add(LogLevel::Error, type.user_id_empty);
    return -1;
  }
  std::lock_guard<std::mutex> hold(g_recorder.lock);
  std::string &path = g_recorder.path;
  path = Storage().logs;
  path += event.game_id;
  path += ".log";
  return RecordLocked(messages, event, path, false);
}

} // namespace orvane
