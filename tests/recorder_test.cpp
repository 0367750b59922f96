// The event log through the analytics exports: messages in order, results,
// and the bytes of the log file, with faults injected into single calls.
#include "OrvaneSDK.h"
#include "analytics/record_cipher.h"
#include "support/test_support.h"

#include <filesystem>
#include <new>

namespace orvane::testing {
namespace {

class RecorderTest : public SandboxTest {
protected:
  std::vector<std::string> Log(const char *game = "g1") {
    const KeyBlock &block = GetKeyBlock(); // the first game id of this process
    return Records(LogPath(game), std::string(block.keyText.begin(), block.keyText.end()));
  }
};

std::string Rec(const std::string &type, const std::string &extra = "", const std::string &user = "u1") {
  return "{\"user_id\":\"" + user + "\",\"game_id\":\"g1\",\"type\":\"" + type +
         "\",\"time\":\"T\",\"extra\":\"" + extra + "\"}";
}
Message Info(const std::string &type, const char *text) {
  return {0, "[OrvaneSDK] Analytics " + type + " - " + text};
}
Message Warn(const std::string &type, const char *text) {
  return {1, "[OrvaneSDK] Analytics " + type + " - " + text};
}
Message Err(const std::string &type, const std::string &text) {
  return {2, "[OrvaneSDK] Analytics " + type + " - " + text};
}
const Message kInitializeOk{0, "[OrvaneSDK] Initialize() - OK."};
const Message kNeverInitialized = Warn("ENTER", "log was never initialized. Initialized the game log");

// The worked example of a new machine, then the log's later life; the last
// event comes from inside a message of the one before, as a host's callback
// may do: it would wait for itself if messages went out under a lock.
bool g_reenter = false;
void ORVANE_CALL RecordFromInside(LogLevel level, const char *message) {
  CaptureMessage(level, message);
  if (g_reenter &&
      std::string_view(message).ends_with("ENTER - log was never initialized. Initialized the game log"))
    g_reenter = false,
    CaptureMessage(LogLevel::Info, oAnalyticsGameExit("g1", "u1") == 0 ? "nested 0" : "nested -1");
}

TEST_F(RecorderTest, ALogFromItsFirstEventOn) {
  g_reenter = true;
  oRegisterForLogs(RecordFromInside);
  Captured().clear();
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  EXPECT_EQ(Captured(),
            (std::vector<Message>{Info("ENTER", "SDK was never initialized. Initializing the SDK."),
                                  kInitializeOk,
                                  kNeverInitialized,
                                  Info("EXIT", "OK"),
                                  {0, "nested 0"},
                                  Info("INIT", "OK"),
                                  Info("ENTER", "OK")}));
  EXPECT_EQ(Split(*ReadFile(LogPath("g1")), "\n").size(), 3u) << "line breaks only between lines";
  Captured().clear();
  EXPECT_EQ(oAnalyticsInit("g1", "u1"), 0);
  EXPECT_EQ(oAnalyticsSpecial("g1", "u\"1", "a\"b\\c\nd\te\x01\x7f\xff"), 0);
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", nullptr), 0);
  EXPECT_EQ(Captured(), (std::vector<Message>{Warn("INIT", "log had been already initialized."),
                                              Info("SPECIAL", "OK"), Info("SPECIAL", "OK")}));
  EXPECT_EQ(Log(), (std::vector<std::string>{Rec("INIT"), Rec("ENTER"), Rec("EXIT"),
                                             Rec("SPECIAL", "a\\\"b\\\\c\\nd\\te\\u0001\x7f\xff", "u\\\"1"),
                                             Rec("SPECIAL")}));
}

TEST_F(RecorderTest, InitStartsAnEmptyLogOnly) {
  const std::optional<std::string> existing[] = {std::nullopt, "", "x"};
  for (const std::optional<std::string> &before : existing) {
    std::filesystem::create_directories(where_.logs);
    std::filesystem::remove(LogPath("g1"));
    if (before) WriteFile(LogPath("g1"), *before);
    Captured().clear();
    EXPECT_EQ(oAnalyticsInit("g1", "u1"), 0);
    if (before == "x") {
      EXPECT_EQ(Captured(), std::vector<Message>{Warn("INIT", "log had been already initialized.")});
      EXPECT_EQ(ReadFile(LogPath("g1")), "x");
    } else {
      EXPECT_EQ(Captured(), std::vector<Message>{Info("INIT", "OK")});
      EXPECT_EQ(Log(), std::vector<std::string>{Rec("INIT")});
    }
  }
}

// A refused call sends one Error and touches nothing; control bytes of a game
// id are shown as \xNN, so that an id cannot forge lines in the host's log.
TEST_F(RecorderTest, RefusedCallsTouchNothing) {
  const std::pair<const char *, const char *> refused[] = {{nullptr, "failed. Game id is empty"},
                                                           {"", "failed. Game id is empty"},
                                                           {"g1", "failed. User id is empty"}};
  for (const auto &[game, text] : refused) {
    Captured().clear();
    EXPECT_EQ(oAnalyticsGameEnter(game, game ? nullptr : ""), -1);
    EXPECT_EQ(Captured(), std::vector<Message>{Err("ENTER", text)});
  }
  std::filesystem::create_directories(where_.logs);
  const std::pair<std::string, std::string> hostile[] = {
      {"../x", "../x"},
      {"..\\x", "..\\x"},
      {"..", ".."},
      {"CON", "CON"},
      {"nul.txt", "nul.txt"},
      {"a|b", "a|b"},
      {"x.", "x."},
      {"/abs", "/abs"},
      {"t\tb\x7f", "t\\x09b\\x7f"},
      {"x\n[OrvaneSDK] y - OK\x1b[2K", "x\\x0a[OrvaneSDK] y - OK\\x1b[2K"}};
  for (const auto &[id, shown] : hostile) {
    Captured().clear();
    EXPECT_EQ(oAnalyticsInit(id.c_str(), "u1"), -1);
    EXPECT_EQ(Captured(), std::vector<Message>{
                              Err("INIT", "log file failed to open. Maybe a bad game_id (" + shown + ")?")});
  }
  EXPECT_TRUE(std::filesystem::is_empty(where_.logs));
  EXPECT_EQ(std::distance(std::filesystem::recursive_directory_iterator(base_), {}), 3);
}

// Faults injected into single platform and cipher calls.
int g_calls_left; // calls that go through before the injected ones fail
bool Spend() { return g_calls_left-- > 0; }
const platform::Calls &Os() { return platform::native_calls(); }
std::string g_logs;
platform::FileHandle FailingOpen(const char *path, std::int64_t &size) {
  return Spend() ? Os().open_log(path, size) : platform::kNoFile;
}
// Another process makes the logs directory while this open fails.
platform::FileHandle OpenRacingAnotherProcess(const char *path, std::int64_t &size) {
  if (std::filesystem::exists(g_logs)) return Os().open_log(path, size);
  std::filesystem::create_directories(g_logs);
  return platform::kNoFile;
}
platform::FileHandle OpenOfUnknownSize(const char *path, std::int64_t &size) {
  const platform::FileHandle file = Os().open_log(path, size);
  size = -1;
  return file;
}
bool ShortAppend(platform::FileHandle f, const void *d, std::size_t n) { // a full disk: half the line goes in
  return Spend() ? Os().append(f, d, n) : (Os().append(f, d, n / 2), false);
}
bool ThrowingAppend(platform::FileHandle, const void *, std::size_t) { throw std::bad_alloc(); }
bool FailingClose(platform::FileHandle f) { return Os().close_file(f) && Spend(); }
bool FailingMakeDirectory(const char *) { return false; }
std::ptrdiff_t FailingEncrypt(cipher::Session *, const std::uint8_t *, std::size_t, std::uint8_t *) {
  return -1;
}
// Another writer holds the lock past the wait; time moves 100 ms per reading
// of the clock, however short the pauses.
int g_lock_tries, g_pauses;
std::int64_t g_now_ms;
platform::LockResult BusyLock(platform::FileHandle) { return ++g_lock_tries, platform::LockResult::kBusy; }
platform::LockResult RivalStartsTheLog(platform::FileHandle) { // during the wait
  std::int64_t size = 0;
  const platform::FileHandle rival = Os().open_log((g_logs + "g1.log").c_str(), size);
  if (size == 0) Os().append(rival, "rival-init", 10);
  Os().close_file(rival);
  return BusyLock(rival);
}
platform::LockResult RivalStartsTheLogThenYields(platform::FileHandle file) {
  RivalStartsTheLog(file);
  return Os().try_lock_file(file);
}
void InjectBusyLock(platform::LockResult (*lock)(platform::FileHandle)) {
  platform::calls().try_lock_file = lock;
  platform::calls().steady_milliseconds = [] { return g_now_ms += 100; };
  platform::calls().sleep_milliseconds = [](int) { ++g_pauses; };
}

TEST_F(RecorderTest, FaultsAreReportedNeverOk) {
  struct Case {
    const char *name;
    bool initialised; // the log already holds its INIT line
    void (*inject)();
    int result;
    std::vector<Message> messages;
    std::vector<std::string> records; // after the call
  };
  const std::string open_failed = "log file failed to open. Maybe a bad game_id (g1)?";
  const Case cases[] = {
      {"open fails",
       true,
       [] { platform::calls().open_log = FailingOpen; },
       -1,
       {Err("ENTER", open_failed)},
       {Rec("INIT")}},
      {"open fails while another process makes the directory: tried again",
       false,
       [] { std::filesystem::remove_all(g_logs), platform::calls().open_log = OpenRacingAnotherProcess; },
       0,
       {kNeverInitialized, Info("INIT", "OK"), Info("ENTER", "OK")},
       {Rec("INIT"), Rec("ENTER")}},
      {"storage cannot be made",
       false,
       [] { std::filesystem::remove_all(g_logs), platform::calls().make_directory = FailingMakeDirectory; },
       -1,
       {Info("ENTER", "SDK was never initialized. Initializing the SDK."),
        {2, "[OrvaneSDK] Initialize() - failed."},
        Err("ENTER", open_failed)},
       {}},
      {"write fails: the fragment stays apart",
       true,
       [] { platform::calls().append = ShortAppend; },
       -1,
       {Err("ENTER", "log file failed to write.")},
       {Rec("INIT"), "(undecryptable)"}},
      {"first write fails: cut back, so no log starts without INIT",
       false,
       [] { platform::calls().append = ShortAppend; },
       -1,
       {kNeverInitialized, Err("INIT", "log file failed to write."),
        Err("ENTER", "log file failed to write.")},
       {}},
      {"close fails",
       true,
       [] { platform::calls().close_file = FailingClose; },
       -1,
       {Err("ENTER", "log file failed to write.")},
       {Rec("INIT"), Rec("ENTER")}},
      {"cipher fails",
       true,
       [] { cipher::backend().encrypt = FailingEncrypt; },
       -1,
       {Err("ENTER", "failed. Record encryption failed.")},
       {Rec("INIT")}},
      {"size unknown counts as not empty",
       false,
       [] { platform::calls().open_log = OpenOfUnknownSize; },
       0,
       {Info("ENTER", "OK")},
       {"(undecryptable)", Rec("ENTER")}},
      {"empty log locked by another writer past the deadline",
       false,
       [] { InjectBusyLock(BusyLock); },
       -1,
       {Err("ENTER", "log file is locked by another process.")},
       {}},
      {"another writer starts the log during the wait: after a line break",
       false,
       [] { InjectBusyLock(RivalStartsTheLog); },
       0,
       {Info("ENTER", "OK")},
       {"(undecryptable)", Rec("ENTER")}},
      {"another writer starts the log before the lock is had",
       false,
       [] { InjectBusyLock(RivalStartsTheLogThenYields); },
       0,
       {Info("ENTER", "OK")},
       {"(undecryptable)", Rec("ENTER")}},
      {"an exception under the lock gives lock and file back",
       false,
       [] { platform::calls().append = ThrowingAppend; },
       -1,
       {kNeverInitialized, Err("ENTER", "failed. Internal error.")},
       {}},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    g_logs = where_.logs;
    std::filesystem::create_directories(where_.logs);
    std::filesystem::remove(LogPath("g1"));
    if (c.initialised) {
      ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
    }
    Captured().clear();
    g_calls_left = 0;
    g_lock_tries = g_pauses = 0;
    {
      const CallsGuard restore;
      c.inject();
      EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), c.result);
    }
    EXPECT_EQ(Captured(), c.messages);
    EXPECT_EQ(Log(), c.records);
    EXPECT_LE(g_lock_tries, 10) << "the wait ends at its deadline, after 1 s of a clock read once a try";
    EXPECT_EQ(g_pauses + (g_lock_tries > 0), g_lock_tries) << "a pause between tries, none after the last";
    Captured().clear(); // and the recorder is whole again
    EXPECT_EQ(oAnalyticsGameExit("g1", "u1"), 0);
    EXPECT_EQ(Captured().back(), Info("EXIT", "OK"));
  }
}

// A line holds at most 64 MiB: a larger record is refused before anything
// is written; one of 30 MiB (a 60 MiB line) goes in.
TEST_F(RecorderTest, RecordTooLargeIsRefusedBeforeAnythingIsWritten) {
  ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
  Captured().clear();
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", std::string(std::size_t{32} << 20, 'x').c_str()), -1);
  EXPECT_EQ(Log(), std::vector<std::string>{Rec("INIT")});
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", std::string(std::size_t{30} << 20, 'x').c_str()), 0);
  EXPECT_EQ(Captured(),
            (std::vector<Message>{Err("SPECIAL", "failed. Record too large."), Info("SPECIAL", "OK")}));
}

} // namespace
} // namespace orvane::testing
