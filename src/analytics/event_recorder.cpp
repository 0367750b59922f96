#include "analytics/event_recorder.h"

#include "analytics/game_id.h"
#include "analytics/record_cipher.h"
#include "core/storage.h"
#include "logformat/hex.h"
#include "logformat/record_text.h"
#include "logformat/timestamp.h"
#include "platform/platform.h"

#include <atomic>
#include <string>
#include <string_view>

namespace orvane {

#define ORVANE_EVENT_TYPE(TYPE)                                                                              \
  {                                                                                                          \
    TYPE, "[OrvaneSDK] Analytics " TYPE " - OK",                                                             \
        "[OrvaneSDK] Analytics " TYPE " - failed. Game id is empty",                                         \
        "[OrvaneSDK] Analytics " TYPE " - failed. User id is empty",                                         \
        "[OrvaneSDK] Analytics " TYPE " - SDK was never initialized. Initializing the SDK.",                 \
        "[OrvaneSDK] Analytics " TYPE " - log file failed to open. Maybe a bad game_id (",                   \
        "[OrvaneSDK] Analytics " TYPE " - log had been already initialized.",                                \
        "[OrvaneSDK] Analytics " TYPE " - log was never initialized. Initialized the game log",              \
        "[OrvaneSDK] Analytics " TYPE " - log file failed to write.",                                        \
        "[OrvaneSDK] Analytics " TYPE " - log file is locked by another process.",                           \
        "[OrvaneSDK] Analytics " TYPE " - failed. Record encryption failed.",                                \
        "[OrvaneSDK] Analytics " TYPE " - failed. Record too large.",                                        \
        "[OrvaneSDK] Analytics " TYPE " - failed. Internal error."                                           \
  }

const EventType kInitEvent = ORVANE_EVENT_TYPE("INIT");
const EventType kEnterEvent = ORVANE_EVENT_TYPE("ENTER");
const EventType kExitEvent = ORVANE_EVENT_TYPE("EXIT");
const EventType kSpecialEvent = ORVANE_EVENT_TYPE("SPECIAL");

#undef ORVANE_EVENT_TYPE

namespace {

// A line that one write takes whole on every platform (Linux writes at most
// 0x7ffff000 bytes at once), with room to spare for the INIT line that may
// go in the same write.
constexpr std::size_t kMaxLineBytes = std::size_t{64} << 20;
// Buffers that one large event grew past this are given back when its call
// ends, so that it does not keep the memory for good.
constexpr std::size_t kKeptBufferBytes = std::size_t{1} << 20;
// How long the first event of a log waits for another writer's lock.
constexpr std::int64_t kLockWaitMilliseconds = 1000;
constexpr int kLockPauseMilliseconds = 5;

// What one recording works in besides its arguments. Each call takes one of
// its own, so that threads never wait for each other: two recordings meet
// only in the file system, where O_APPEND keeps lines whole and the file
// lock keeps one INIT line first in each log, between threads as between
// processes.
struct Workspace {
  std::string path;
  std::string record;
  std::string line;      // the event's line, after a line break unless INIT
  std::string init_line; // the INIT line that a first event writes before it
  TimestampCache clock;
  RecordCipher cipher;
};

// Idle workspaces, so that ordinary events allocate nothing. A slot holds a
// workspace or null; exchanging it hands the workspace over, so no lock is
// needed. More threads recording at once than there are slots get a
// workspace of their own for the call. Never destroyed: calls may come from
// the game's exit handlers.
constexpr std::size_t kIdleSlots = 16;
std::atomic<Workspace *> g_idle[kIdleSlots];

void Trim(std::string &buffer) {
  if (buffer.capacity() > kKeptBufferBytes) std::string().swap(buffer);
}

struct WorkspaceLease {
  Workspace *space = nullptr;

  WorkspaceLease() {
    for (std::atomic<Workspace *> &slot : g_idle)
      if (slot.load(std::memory_order_relaxed) != nullptr &&
          (space = slot.exchange(nullptr, std::memory_order_acquire)) != nullptr)
        return;
    space = new Workspace;
  }
  ~WorkspaceLease() {
    Trim(space->path); // a refused game id may be as long as the host likes
    Trim(space->record);
    Trim(space->line);
    Trim(space->init_line);
    if (space->cipher.ciphertext.capacity() > kKeptBufferBytes)
      std::vector<std::uint8_t>().swap(space->cipher.ciphertext);
    for (std::atomic<Workspace *> &slot : g_idle) {
      Workspace *empty = nullptr;
      if (slot.compare_exchange_strong(empty, space, std::memory_order_release)) return;
    }
    delete space;
  }
  WorkspaceLease(const WorkspaceLease &) = delete;
  WorkspaceLease &operator=(const WorkspaceLease &) = delete;
};

// An open log and the lock on it, given back on every path out of a call,
// an exception included: a leaked handle would keep the lock held.
struct LogFile {
  platform::FileHandle handle = platform::kNoFile;
  std::int64_t size = -1; // measured under `lock` when it is kLocked
  // The shared lock while the call appends, exclusive while it starts the
  // log; kBusy while it holds none yet, kFailed where the file system has no
  // locks.
  platform::LockResult lock = platform::LockResult::kFailed;
  bool exclusive = false;

  LogFile() = default;
  LogFile(const LogFile &) = delete;
  LogFile &operator=(const LogFile &) = delete;
  ~LogFile() {
    if (handle != platform::kNoFile) Close();
  }
  // True when everything written reached the file.
  // The shared lock goes with the handle, so the common event pays no call
  // for it; the exclusive one is given back first, so that a child forked
  // meanwhile cannot keep other writers from the log.
  bool Close() {
    const platform::Calls &os = platform::calls();
    if (exclusive) os.unlock_file(handle);
    exclusive = false;
    const bool closed = os.close_file(handle);
    handle = platform::kNoFile;
    return closed;
  }
};

std::string_view Text(const char *text) { return text ? std::string_view(text) : std::string_view(); }

struct Event {
  std::string_view game_id;
  std::string_view user_id;
  const EventType &type;
  std::string_view extra;
  const KeyText &key_text;
};

// Bytes of a game id that a message shows: hosts forward messages to their
// consoles, so a huge id must not come back whole.
constexpr std::size_t kShownGameIdBytes = 256;

// The game id as a message may show it: control bytes would let a hostile id
// forge lines in the host's own log, so they appear as \xNN; past its first
// kShownGameIdBytes bytes it is cut and "..." marks the cut.
void AppendPrintable(std::string &out, std::string_view text) {
  const bool cut = text.size() > kShownGameIdBytes;
  for (const char c : text.substr(0, kShownGameIdBytes)) {
    const auto byte = static_cast<std::uint8_t>(c);
    if (byte >= 0x20 && byte != 0x7f) {
      out += c;
    } else {
      out += "\\x";
      AppendHex(out, &byte, 1);
    }
  }
  if (cut) out += "...";
}

// Opens the game's log. The directory is examined only when the open fails,
// which spares the common event a system call and sends the host the same
// messages in the same order as examining it first.
void OpenLog(MessageBatch &messages, const Event &event, const std::string &path, LogFile &log) {
  const platform::Calls &os = platform::calls();
  const std::string &logs = Storage().logs;
  const bool usable = IsUsableGameId(event.game_id) && !logs.empty();
  if (usable) log.handle = os.open_log(path.c_str(), log.lock, log.size);
  if (log.handle != platform::kNoFile) return;
  if (!DirectoryExists(logs.c_str())) {
    messages.Add(LogLevel::Info, event.type.sdk_not_initialized);
    InitializeStorage(messages);
  } else if (usable) {
    MendStorage();
  }
  // Whoever made the directory (this call, or another process starting at the
  // same moment), the open is worth one more try once it is there.
  if (usable && DirectoryExists(logs.c_str())) log.handle = os.open_log(path.c_str(), log.lock, log.size);
  if (log.handle == platform::kNoFile) {
    std::string text = event.type.open_failed;
    AppendPrintable(text, event.game_id);
    text += ")?";
    messages.AddOwned(LogLevel::Error, std::move(text));
  }
}

// Takes the lock this call writes under, waiting until a deadline on the
// steady clock: a count of pauses would not bound the time, since signals
// cut pauses short and Windows stretches them to its timer tick. A log is
// appended to under the shared lock and started only under the exclusive
// one, which is had once the log is seen empty: so the writer that starts a
// log meets no other writer, and the first line it cuts back when it went in
// torn cannot take another's line with it. The size is taken again whenever a
// lock is newly had. This is the only lock a recording takes, and it is
// given back before the call's messages go to the host, so a callback may
// record again (src/README.md, "Locks"). False when other writers kept the
// log past the deadline; true also where the file system offers no lock
// (nothing can keep other writers out there, and refusing would leave the
// log without events).
bool LockWithinDeadline(LogFile &log) {
  const platform::Calls &os = platform::calls();
  const std::int64_t deadline = os.steady_milliseconds() + kLockWaitMilliseconds;
  for (;;) {
    if (log.lock == platform::LockResult::kFailed || log.exclusive) return true;
    if (log.lock == platform::LockResult::kLocked) {
      if (log.size != 0) return true;
      log.lock = os.try_lock_file(log.handle, platform::LockMode::kExclusive);
      log.exclusive = log.lock == platform::LockResult::kLocked;
    } else {
      // Another writer holds the log to start it: this one waits for its
      // outcome, or, while writers hold it shared, for a moment to start it.
      log.lock = os.try_lock_file(log.handle, platform::LockMode::kShared);
    }
    if (log.lock == platform::LockResult::kLocked) {
      log.size = os.file_size(log.handle);
      continue;
    }
    if (log.lock == platform::LockResult::kFailed) return true;
    if (os.steady_milliseconds() >= deadline) return false;
    os.sleep_milliseconds(kLockPauseMilliseconds);
  }
}

enum class Encoded { kLine, kTooLarge, kCipherFailed };

// Appends the encrypted line of one record of `type` to `out`.
Encoded EncodeLine(Workspace &space, const Event &event, const EventType &type, std::string_view time,
                   std::string &out) {
  // The event's own line stores what its export passed; the INIT line that
  // a first event writes in front of it stores none.
  const std::string_view extra = &type == &event.type ? event.extra : std::string_view();
  // The record is at least its unescaped values and the fixed text; a record
  // too large even so is refused before it is composed.
  const std::size_t least = kRecordFixedBytes + event.user_id.size() + event.game_id.size() +
                            std::string_view(type.name).size() + time.size() + extra.size();
  if (least > kMaxLineBytes / 2) return Encoded::kTooLarge;
  space.record.clear();
  AppendEventRecord(space.record, event.game_id, event.user_id, type.name, time, extra);
  if (2 * cipher::CiphertextSize(space.record.size()) > kMaxLineBytes) return Encoded::kTooLarge;
  if (!EncryptRecordText(space.cipher, event.key_text, space.record, out)) return Encoded::kCipherFailed;
  return Encoded::kLine;
}

const char *EncodeFailure(const EventType &type, Encoded failure) {
  return failure == Encoded::kTooLarge ? type.too_large : type.encryption_failed;
}

std::int32_t Record(MessageBatch &messages, Workspace &space, const Event &event) {
  const platform::Calls &os = platform::calls();
  const EventType &type = event.type;
  const bool is_init = &type == &kInitEvent;
  LogFile log;
  OpenLog(messages, event, space.path, log);
  if (log.handle == platform::kNoFile) return -1;
  // Another writer holds the log to start it, or the log is empty: the size
  // that decides this call is the one taken under the lock it writes under.
  const bool waits =
      log.lock == platform::LockResult::kBusy || (log.lock == platform::LockResult::kLocked && log.size == 0);
  if (waits && !LockWithinDeadline(log)) {
    messages.Add(LogLevel::Error, type.locked_out);
    return -1;
  }
  // A size that cannot be taken tells nothing of whether the log has its INIT
  // line: nothing is written.
  if (log.size < 0) {
    messages.Add(LogLevel::Error, type.write_failed);
    return -1;
  }
  if (is_init && log.size != 0) {
    messages.Add(LogLevel::Warning, type.already_initialized);
    return 0;
  }

  const std::string_view time = space.clock.At(os.now_seconds());
  space.line.clear();
  if (!is_init) space.line = platform::line_break();
  if (const Encoded encoded = EncodeLine(space, event, type, time, space.line); encoded != Encoded::kLine) {
    messages.Add(LogLevel::Error, EncodeFailure(type, encoded));
    return -1;
  }

  // A first event writes the INIT line and its own in one write, so that no
  // log ever starts with anything else. Where no lock keeps other writers
  // out, two may both find the log empty: each then puts a line break in
  // front, so that their lines cannot run together (readers skip the empty
  // line).
  const bool starts_log = log.size == 0;
  const bool init_first = starts_log && !is_init;
  std::string_view bytes = space.line;
  if (starts_log && (init_first || !log.exclusive)) {
    space.init_line.clear();
    if (!log.exclusive) space.init_line = platform::line_break();
    if (init_first) {
      messages.Add(LogLevel::Warning, type.log_not_initialized);
      if (const Encoded encoded = EncodeLine(space, event, kInitEvent, time, space.init_line);
          encoded != Encoded::kLine) {
        messages.Add(LogLevel::Error, EncodeFailure(kInitEvent, encoded));
        messages.Add(LogLevel::Error, EncodeFailure(type, encoded));
        return -1;
      }
    }
    space.init_line += space.line;
    bytes = space.init_line;
  }
  bool written = os.append(log.handle, bytes.data(), bytes.size());
  // A torn first line would leave the log without a readable INIT line for
  // good; it is cut away while the exclusive lock keeps every other writer
  // out. Later lines are never cut: others may have written behind them.
  if (!written && starts_log && log.exclusive) os.truncate_file(log.handle, 0);
  written = log.Close() && written;
  if (!written) {
    if (init_first) messages.Add(LogLevel::Error, kInitEvent.write_failed);
    messages.Add(LogLevel::Error, type.write_failed);
    return -1;
  }
  if (init_first) messages.Add(LogLevel::Info, kInitEvent.ok);
  messages.Add(LogLevel::Info, type.ok);
  return 0;
}

} // namespace

std::int32_t RecordEvent(MessageBatch &messages, const char *game_id, const char *user_id,
                         const EventType &type, const char *extra) {
  // The first event of the process fixes the key text, whatever its outcome.
  const KeyText &key_text = TakeKeyText(game_id);
  const Event event{Text(game_id), Text(user_id), type, Text(extra), key_text};
  if (event.game_id.empty()) {
    messages.Add(LogLevel::Error, type.game_id_empty);
    return -1;
  }
  if (event.user_id.empty()) {
    messages.Add(LogLevel::Error, type.user_id_empty);
    return -1;
  }
  const WorkspaceLease lease;
  Workspace &space = *lease.space;
  space.path = Storage().logs;
  space.path += event.game_id;
  space.path += ".log";
  return Record(messages, space, event);
}

} // namespace orvane
