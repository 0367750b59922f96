// The event log through the analytics exports: messages in order, results,
// and the bytes of the log file, with faults injected into single calls.
#include "OrvaneSDK.h"
#include "core/storage.h"
#include "support/test_support.h"

#include <atomic>
#include <cstdlib>
#include <filesystem>
#include <new>

static std::atomic<long> g_allocations{0}; // of this whole program, counted by the operator new below
static std::atomic<std::size_t> g_largest{0}; // the largest since a test set it to 0

void *operator new(std::size_t size) {
  ++g_allocations;
  if (size > g_largest) g_largest = size;
  if (void *block = std::malloc(size != 0 ? size : 1)) return block;
  throw std::bad_alloc();
}
// GCC takes the malloc inside the operator new above for a mismatch of its own.
#pragma GCC diagnostic ignored "-Wmismatched-new-delete"
void operator delete(void *block) noexcept { std::free(block); }
void operator delete(void *block, std::size_t) noexcept { std::free(block); }

namespace orvane::testing {
namespace {

class RecorderTest : public SandboxTest {
protected:
  std::vector<std::string> Log() { // under the key of the first game id of this process
    return Records(LogPath("g1"), KeyTextFor("g1"));
  }
};

std::string Rec(const std::string &type, const std::string &extra = "") {
  return R"({"user_id":"u1","game_id":"g1","type":")" + type + R"(","time":"T","extra":")" + extra + "\"}";
}
// A message of an analytics export: level 0 Info, 1 Warning, 2 Error.
Message A(int level, const std::string &type, const std::string &text) {
  return {level, "[OrvaneSDK] Analytics " + type + " - " + text};
}
const Message kSdkNeverInitialized = A(0, "ENTER", "SDK was never initialized. Initializing the SDK.");
const Message kNeverInitialized = A(1, "ENTER", "log was never initialized. Initialized the game log");
const Message kOpenFailed = A(2, "ENTER", "log file failed to open. Maybe a bad game_id (g1)?");
const std::string kTorn = "(undecryptable)";

// The worked example of a new machine, then the log's later life; the EXIT
// comes from inside a message of the first event, as a host's callback may
// do: it would wait for itself if messages went out under a lock.
bool g_reenter = true;
void ORVANE_CALL RecordFromInside(LogLevel level, const char *message) {
  CaptureMessage(level, message);
  if (!g_reenter || message != kNeverInitialized.second) return;
  g_reenter = false;
  CaptureMessage(LogLevel::Info, oAnalyticsGameExit("g1", "u1") == 0 ? "nested 0" : "-1");
}

TEST_F(RecorderTest, ALogFromItsFirstEventOn) {
  oRegisterForLogs(RecordFromInside);
  Captured().clear();
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  EXPECT_EQ(Captured(),
            (std::vector<Message>{kSdkNeverInitialized, Message{0, "[OrvaneSDK] Initialize() - OK."},
                                  kNeverInitialized, A(0, "EXIT", "OK"), Message{0, "nested 0"},
                                  A(0, "INIT", "OK"), A(0, "ENTER", "OK")}));
  EXPECT_EQ(Split(*ReadFile(LogPath("g1")), "\n").size(), 3u) << "line breaks only between lines";
  Captured().clear();
  EXPECT_EQ(oAnalyticsInit("g1", "u1"), 0);
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", "score=10") + oAnalyticsSpecial("g1", "u1", nullptr), 0);
  EXPECT_EQ(Captured(), (std::vector<Message>{A(1, "INIT", "log had been already initialized."),
                                              A(0, "SPECIAL", "OK"), A(0, "SPECIAL", "OK")}));
  EXPECT_EQ(Log(), (std::vector<std::string>{Rec("INIT"), Rec("ENTER"), Rec("EXIT"),
                                             Rec("SPECIAL", "score=10"), Rec("SPECIAL")}));
}

// A refused call sends one Error and touches nothing; control bytes of a game
// id are shown as \xNN, so that an id cannot forge lines in the host's log.
TEST_F(RecorderTest, RefusedCallsTouchNothing) {
  const std::pair<const char *, const char *> refused[] = {
      {nullptr, ""}, {"", nullptr}, {"g1", nullptr}, {"g1", ""}};
  for (const auto &[game, user] : refused) EXPECT_EQ(oAnalyticsGameEnter(game, user), -1);
  const Message game = A(2, "ENTER", "failed. Game id is empty"),
                user = A(2, "ENTER", "failed. User id is empty");
  EXPECT_EQ(Captured(), (std::vector<Message>{game, game, user, user}));
  std::filesystem::create_directories(where_.logs);
  // Which ids are refused is the game-id rule's test. An id is shown up to
  // its first 256 bytes, counted before escaping.
  std::string escaped;
  while (escaped.size() < 256 * 4) escaped += "\\x01";
  // clang-format off
  const std::pair<std::string, std::string> hostile[] = {
      {"../x", "../x"}, {"CON", "CON"}, {"t\tb\x7f", "t\\x09b\\x7f"},
      {"x\n[OrvaneSDK] y - OK\x1b[2K", "x\\x0a[OrvaneSDK] y - OK\\x1b[2K"},
      {std::string(256, 'a'), std::string(256, 'a')}, {std::string(257, 'a'), std::string(256, 'a') + "..."},
      {std::string(1 << 20, '\x01'), escaped + "..."}};
  // clang-format on
  for (const auto &[id, shown] : hostile) {
    Captured().clear();
    EXPECT_EQ(oAnalyticsInit(id.c_str(), "u1"), -1) << shown;
    const std::string text = "log file failed to open. Maybe a bad game_id (" + shown + ")?";
    EXPECT_EQ(Captured(), std::vector<Message>{A(2, "INIT", text)});
  }
  EXPECT_EQ(std::distance(std::filesystem::recursive_directory_iterator(base_), {}), 4) << "the four folders";
}

// Faults injected into single platform and cipher calls.
platform::Calls &Live() { return platform::calls(); }
using cipher::Session;
using platform::FileHandle;
using platform::LockMode;
using platform::LockResult;
std::string g_logs;
std::int64_t g_now_ms;
// Another process makes the logs directory while this open fails.
FileHandle OpenRacingAnotherProcess(const char *path, LockResult &lock, std::int64_t &size) {
  if (std::filesystem::exists(g_logs)) return os.open_log(path, lock, size);
  std::filesystem::create_directories(g_logs);
  return platform::kNoFile;
}
bool ShortAppend(FileHandle f, const void *d, std::size_t n) { // a full disk: a third goes in
  os.append(f, d, n / 3);
  return false;
}
// Another writer records while this one writes: into an empty log, or one
// torn (g_tear), not yet cut back.
bool g_tear;
bool AnotherRecordsMeanwhile(FileHandle f, const void *d, std::size_t n) {
  Live().append = os.append;
  if (g_tear) os.append(f, d, n / 3);
  oAnalyticsGameEnter("g1", "u1");
  return !g_tear && os.append(f, d, n);
}
void TearWhileAnotherRecords() { // the other writer's wait ends at the first reading of its deadline
  g_tear = true;
  Live().append = AnotherRecordsMeanwhile;
  Live().steady_milliseconds = [] { return g_now_ms += 2000; };
}
void NoLocks(bool (*append)(FileHandle, const void *, std::size_t)) {
  Live().open_log = [](const char *path, LockResult &lock, std::int64_t &size) {
    const FileHandle f = os.open_log(path, lock, size);
    lock = LockResult::kFailed;
    return f;
  };
  Live().try_lock_file = [](FileHandle, LockMode) { return LockResult::kFailed; };
  Live().append = append;
}
// A writer that the file system refuses locks records while this one, which
// holds the exclusive lock, writes the log's first line.
bool LocklessRecordsMeanwhile(FileHandle f, const void *d, std::size_t n) {
  NoLocks(os.append);
  oAnalyticsGameEnter("g1", "u1");
  Live().open_log = os.open_log;
  Live().try_lock_file = os.try_lock_file;
  return os.append(f, d, n);
}
// Another writer holds the lock; time moves 100 ms per reading of the clock,
// however short the pauses.
int g_lock_tries;
int g_pauses;
LockResult BusyLock(FileHandle, LockMode) {
  ++g_lock_tries;
  return LockResult::kBusy;
}
// Holds it at the first try, to start the log, then is gone.
LockResult RivalStartsTheLog(FileHandle file, LockMode mode) {
  if (g_lock_tries++ > 0) return os.try_lock_file(file, mode);
  std::int64_t size = 0;
  LockResult lock;
  const FileHandle rival = os.open_log((g_logs + "g1.log").c_str(), lock, size);
  if (size == 0) os.append(rival, "rival-init", 10);
  os.close_file(rival);
  return LockResult::kBusy;
}
void InjectBusyLock(LockResult (*lock)(FileHandle, LockMode)) {
  Live().try_lock_file = lock;
  Live().steady_milliseconds = [] { return g_now_ms += 100; };
  Live().sleep_milliseconds = [](int) { ++g_pauses; };
}

TEST_F(RecorderTest, FaultsAreReportedNeverOk) {
  enum Before { kNoFolder, kNoLog, kEmptyLog, kStarted }; // what the logs folder holds before the call
  struct Case {
    const char *name;
    Before before;
    void (*inject)();
    int result;
    std::vector<Message> messages;
    std::vector<std::string> records = {}; // the log after the call
    bool init = false;                     // the call is an INIT, not an ENTER
  };
  const Message write_failed = A(2, "ENTER", "log file failed to write."), ok = A(0, "ENTER", "OK"),
                init_write_failed = A(2, "INIT", "log file failed to write."), init_ok = A(0, "INIT", "OK"),
                busy = A(2, "ENTER", "log file is locked by another process."),
                init_failed = {2, "[OrvaneSDK] Initialize() - failed."};
  // clang-format off
  const Case cases[] = {
      {"open fails", kStarted,
       [] { Live().open_log = [](const char *, LockResult &, std::int64_t &) { return platform::kNoFile; }; },
       -1, {kOpenFailed}, {Rec("INIT")}},
      {"open fails while another process makes the directory: tried again", kNoFolder,
       [] { Live().open_log = OpenRacingAnotherProcess; }, 0, {kNeverInitialized, init_ok, ok},
       {Rec("INIT"), Rec("ENTER")}},
      {"no folder known (no home directory): refused, not written where the game runs", kNoFolder,
       [] { SetStorageForTesting({}); }, -1, {kSdkNeverInitialized, init_failed, kOpenFailed}},
      {"storage cannot be made", kNoFolder,
       [] { Live().make_private_directories = Live().make_directory = [](const char *) { return false; }; },
       -1, {kSdkNeverInitialized, init_failed, kOpenFailed}},
      {"a log that exists empty starts with INIT", kEmptyLog, [] {}, 0, {kNeverInitialized, init_ok, ok},
       {Rec("INIT"), Rec("ENTER")}},
      {"write fails: the fragment stays apart, as a writer's death leaves one; later lines whole", kStarted,
       [] { Live().append = ShortAppend; }, -1, {write_failed}, {Rec("INIT"), kTorn}},
      {"first write fails: cut back, so no log starts without INIT", kNoLog,
       [] { Live().append = ShortAppend; }, -1, {kNeverInitialized, init_write_failed, write_failed}},
      {"... and no other writer can have written behind it meanwhile", kNoLog, TearWhileAnotherRecords,
       -1, {busy, kNeverInitialized, init_write_failed, write_failed}},
      {"close fails", kStarted,
       [] { Live().close_file = [](FileHandle f) { return os.close_file(f) && false; }; }, -1,
       {write_failed}, {Rec("INIT"), Rec("ENTER")}},
      {"cipher fails", kStarted,
       [] { cipher::backend().encrypt = [](Session *, const std::uint8_t *, std::size_t, std::uint8_t *) {
              return std::ptrdiff_t{-1}; }; }, -1,
       {A(2, "ENTER", "failed. Record encryption failed.")}, {Rec("INIT")}},
      {"size unknown under the lock", kNoLog,
       [] { Live().file_size = [](FileHandle) { return std::int64_t{-1}; }; }, -1, {write_failed}},
      {"empty log locked by another writer past the deadline", kNoLog, [] { InjectBusyLock(BusyLock); },
       -1, {busy}},
      {"another writer holds the log a moment to start it: this one waits, then writes behind it", kNoLog,
       [] { InjectBusyLock(RivalStartsTheLog); }, 0, {ok}, {kTorn, Rec("ENTER")}},
      {"... an INIT that waited so finds the log started", kNoLog, [] { InjectBusyLock(RivalStartsTheLog); },
       0, {A(1, "INIT", "log had been already initialized.")}, {kTorn}, true},
      {"no locks: the log starts all the same; two writers finding it empty keep their lines apart", kNoLog,
       [] { NoLocks(AnotherRecordsMeanwhile); }, 0,
       {kNeverInitialized, init_ok, ok, kNeverInitialized, init_ok, ok},
       {Rec("INIT"), Rec("ENTER"), Rec("INIT"), Rec("ENTER")}},
      {"locks refused to one writer only: its lines and the lock holder's stay apart", kNoLog,
       [] { Live().append = LocklessRecordsMeanwhile; }, 0,
       {kNeverInitialized, init_ok, ok, kNeverInitialized, init_ok, ok},
       {Rec("INIT"), Rec("ENTER"), Rec("INIT"), Rec("ENTER")}},
      {"... a torn first line stays: cutting it may cut another's line", kNoLog, [] { NoLocks(ShortAppend); },
       -1, {kNeverInitialized, init_write_failed, write_failed}, {kTorn}},
      {"locks that fail during the wait: the log starts all the same", kNoLog,
       [] { Live().try_lock_file = [](FileHandle, LockMode) { return LockResult::kFailed; }; }, 0,
       {kNeverInitialized, init_ok, ok}, {Rec("INIT"), Rec("ENTER")}},
      {"an exception under the lock gives lock and file back", kNoLog,
       [] { Live().append = [](FileHandle, const void *, std::size_t) -> bool { throw std::bad_alloc(); }; },
       -1, {kNeverInitialized, A(2, "ENTER", "failed. Internal error.")}},
  };
  // clang-format on
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    g_logs = where_.logs;
    RemoveTree(where_.logs);
    if (c.before != kNoFolder) std::filesystem::create_directories(where_.logs);
    if (c.before == kEmptyLog) WriteFile(LogPath("g1"), "");
    if (c.before == kStarted) {
      ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
    }
    Captured().clear();
    g_lock_tries = 0;
    g_pauses = 0;
    g_tear = false;
    {
      const CallsGuard restore;
      c.inject();
      EXPECT_EQ(c.init ? oAnalyticsInit("g1", "u1") : oAnalyticsGameEnter("g1", "u1"), c.result);
    }
    EXPECT_EQ(Captured(), c.messages);
    EXPECT_EQ(Log(), c.records);
    EXPECT_LE(g_lock_tries, 10) << "the wait ends at its deadline, after 1 s of a clock read once a try";
    EXPECT_EQ(g_pauses + (g_lock_tries > 0), g_lock_tries) << "a pause between tries, none after the last";
    SetStorageForTesting(where_); // and the recorder is whole again
    EXPECT_EQ(oAnalyticsGameExit("g1", "u1"), 0);
    EXPECT_EQ(Log().back(), Rec("EXIT"));
  }
}

// An ordinary event takes an idle workspace, whose buffers an earlier event
// sized, and allocates nothing. (The benchmark counts the cipher's own too.)
TEST_F(RecorderTest, AnOrdinaryEventAllocatesNothing) {
  oRegisterForLogs(Ignore);
  ASSERT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  const long before = g_allocations;
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  EXPECT_EQ(g_allocations - before, 0);
}

// A line holds at most 64 MiB: a larger record is refused before anything
// is written; one whose line is exactly 64 MiB goes in.
TEST_F(RecorderTest, RecordTooLargeIsRefusedBeforeAnythingIsWritten) {
  ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
  ASSERT_EQ(oAnalyticsInit(std::string(100, 'g').c_str(), "u1"), 0) << "a long game id makes no large record";
  Captured().clear();
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", std::string(std::size_t{32} << 20, 'x').c_str()), -1);
  EXPECT_EQ(Log(), std::vector<std::string>{Rec("INIT")});
  g_largest = 0; // 6 MiB of control bytes are 36 MiB once escaped
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", std::string(std::size_t{6} << 20, '\x01').c_str()), -1);
  EXPECT_LT(g_largest, std::size_t{7} << 20) << "refused before it was escaped";
  const std::size_t largest = (std::size_t{32} << 20) - 16 - 88; // 88: the rest of its record; 16: padding
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", std::string(largest, 'x').c_str()), 0);
  EXPECT_EQ(Captured(),
            (std::vector<Message>{A(2, "SPECIAL", "failed. Record too large."),
                                  A(2, "SPECIAL", "failed. Record too large."), A(0, "SPECIAL", "OK")}));
}

} // namespace
} // namespace orvane::testing
