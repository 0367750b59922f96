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

namespace {

// A message that would not fit its buffer writes past it, which no
// constant evaluation allows: the build stops.
constexpr EventType MakeEventType(EventKind kind) {
  EventType type{kind, {}};
  for (std::size_t outcome = 0; outcome < kOutcomeCount; ++outcome) {
    std::array<char, kEventMessageBytes> &text = type.messages[outcome];
    std::size_t end = 0;
    for (const std::string_view part : {std::string_view("[OrvaneSDK] Analytics "), EventTypeName(kind),
                                        std::string_view(" - "), kOutcomeTexts[outcome]})
      for (const char c : part) text[end++] = c;
    text[end] = '\0';
  }
  return type;
}

} // namespace

constexpr EventType kInitEvent = MakeEventType(EventKind::kInit);
constexpr EventType kEnterEvent = MakeEventType(EventKind::kEnter);
constexpr EventType kExitEvent = MakeEventType(EventKind::kExit);
constexpr EventType kSpecialEvent = MakeEventType(EventKind::kSpecial);

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
    messages.Add(LogLevel::Info, Message(event.type, Outcome::kSdkNotInitialized));
    InitializeStorage(messages);
  } else if (usable) {
    MendStorage();
  }
  // Whoever made the directory (this call, or another process starting at the
  // same moment), the open is worth one more try once it is there.
  if (usable && DirectoryExists(logs.c_str())) log.handle = os.open_log(path.c_str(), log.lock, log.size);
  if (log.handle == platform::kNoFile) {
    std::string text = Message(event.type, Outcome::kOpenFailed);
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
    if (log.exclusive) return true;
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

// Appends the encrypted line of one record of the event's game and user to
// `out`: the event's own record, or the INIT record (with no extra) that a
// first event writes in front of it.
Encoded EncodeLine(Workspace &space, const Event &event, std::string_view type, std::string_view extra,
                   std::string_view time, std::string &out) {
  // The record is at least its unescaped values and the fixed text; a record
  // too large even so is refused before it is composed.
  const std::size_t least = kRecordFixedBytes + event.user_id.size() + event.game_id.size() + type.size() +
                            time.size() + extra.size();
  if (least > kMaxLineBytes / 2) return Encoded::kTooLarge;
  // Escapes make a value at most six times its size: a record that could
  // outgrow the line so has its escaped size counted first.
  if (least > kMaxLineBytes / 12) {
    std::size_t escaped = kRecordFixedBytes + type.size() + time.size();
    for (const std::string_view value : {event.user_id, event.game_id, extra}) escaped += JsonEscapedSize(value);
    if (2 * cipher::CiphertextSize(escaped) > kMaxLineBytes) return Encoded::kTooLarge;
  }
  space.record.clear();
  AppendEventRecord(space.record, event.game_id, event.user_id, type, time, extra);
  if (2 * cipher::CiphertextSize(space.record.size()) > kMaxLineBytes) return Encoded::kTooLarge;
  if (!EncryptRecordText(space.cipher, event.key_text, space.record, out)) return Encoded::kCipherFailed;
  return Encoded::kLine;
}

const char *EncodeFailure(const EventType &type, Encoded failure) {
  return Message(type, failure == Encoded::kTooLarge ? Outcome::kTooLarge : Outcome::kEncryptionFailed);
}

std::int32_t Record(MessageBatch &messages, Workspace &space, const Event &event) {
  const platform::Calls &os = platform::calls();
  const EventType &type = event.type;
  const bool is_init = type.kind == EventKind::kInit;
  LogFile log;
  OpenLog(messages, event, space.path, log);
  if (log.handle == platform::kNoFile) return -1;
  // Another writer holds the log to start it, or the log is empty: the size
  // that decides this call is the one taken under the lock it writes under.
  const bool waits =
      log.lock == platform::LockResult::kBusy || (log.lock == platform::LockResult::kLocked && log.size == 0);
  if (waits && !LockWithinDeadline(log)) {
    messages.Add(LogLevel::Error, Message(type, Outcome::kLockedOut));
    return -1;
  }
  // A size that cannot be taken tells nothing of whether the log has its INIT
  // line: nothing is written.
  if (log.size < 0) {
    messages.Add(LogLevel::Error, Message(type, Outcome::kWriteFailed));
    return -1;
  }
  if (is_init && log.size != 0) {
    messages.Add(LogLevel::Warning, Message(type, Outcome::kAlreadyInitialized));
    return 0;
  }

  const std::string_view time = space.clock.At(os.now_seconds());
  space.line.clear();
  if (!is_init) space.line = platform::line_break();
  if (const Encoded encoded =
          EncodeLine(space, event, EventTypeName(type.kind), event.extra, time, space.line);
      encoded != Encoded::kLine) {
    messages.Add(LogLevel::Error, EncodeFailure(type, encoded));
    return -1;
  }

  // A first event writes the INIT line and its own in one write, so that no
  // log ever starts with anything else. Where no lock keeps other writers
  // out, two may both find the log empty: each then puts a line break in
  // front, so that their lines cannot run together (readers skip the empty
  // line). A file system may also refuse locks to one writer and grant them
  // to another (a full lock table, a network share): a writer without a lock
  // may then write between the measurement and the write of one that started
  // the log under the exclusive lock, which puts no break in front. So a
  // writer without a lock also ends its write with a line break: whatever
  // comes after it starts on a line of its own.
  const bool starts_log = log.size == 0;
  const bool init_first = starts_log && !is_init;
  const bool break_first = starts_log && !log.exclusive;
  const bool unlocked = log.lock != platform::LockResult::kLocked;
  if (unlocked) space.line += platform::line_break();
  std::string_view bytes = space.line;
  if (init_first || break_first) {
    space.init_line = break_first ? platform::line_break() : std::string_view();
    if (init_first) {
      messages.Add(LogLevel::Warning, Message(type, Outcome::kLogNotInitialized));
      if (const Encoded encoded =
              EncodeLine(space, event, EventTypeName(EventKind::kInit), {}, time, space.init_line);
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
    if (init_first) messages.Add(LogLevel::Error, Message(kInitEvent, Outcome::kWriteFailed));
    messages.Add(LogLevel::Error, Message(type, Outcome::kWriteFailed));
    return -1;
  }
  if (init_first) messages.Add(LogLevel::Info, Message(kInitEvent, Outcome::kOk));
  messages.Add(LogLevel::Info, Message(type, Outcome::kOk));
  return 0;
}

} // namespace

std::int32_t RecordEvent(MessageBatch &messages, const char *game_id, const char *user_id,
                         const EventType &type, const char *extra) {
  // The first event of the process fixes the key text, whatever its outcome.
  const KeyText &key_text = TakeKeyText(game_id);
  const Event event{Text(game_id), Text(user_id), type, Text(extra), key_text};
  if (event.game_id.empty()) {
    messages.Add(LogLevel::Error, Message(type, Outcome::kGameIdEmpty));
    return -1;
  }
  if (event.user_id.empty()) {
    messages.Add(LogLevel::Error, Message(type, Outcome::kUserIdEmpty));
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
