// The event recorder through the four analytics exports: messages in order,
// results, and the exact bytes of the log file.
#include "OrvaneSDK.h"
#include "cipher/cipher.h"
#include "analytics/record_cipher.h"
#include "support/test_support.h"

#include <filesystem>
#include <new>
#include <regex>
#include <string>
#include <vector>

namespace orvane::testing {
namespace {

std::string g_logs_of_this_test;
const std::string &LogsOfThisTest() { return g_logs_of_this_test; }

class RecorderTest : public SandboxTest {
protected:
  void SetUp() override {
    SandboxTest::SetUp();
    std::filesystem::create_directories(where_.base);
  }
  void TearDown() override {
    cipher::backend() = cipher::native_backend();
    SandboxTest::TearDown();
  }

  // The records of a game's log, decrypted with OpenSSL directly, with each
  // time stamp checked for its form and then replaced by "T".
  std::vector<std::string> Records(std::string_view game_id) {
    std::vector<std::string> records;
    const std::optional<std::string> content = ReadFile(LogPath(game_id));
    if (!content || content->empty()) return records;
    const KeyBlock &block = GetKeyBlock();
    const std::string key(block.keyText.begin(), block.keyText.end());
    static const std::regex time(R"("time":"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d")");
    for (const std::string &line : SplitLogLines(*content)) {
      std::optional<std::string> plain = DecryptLine(line, key);
      if (!plain) {
        records.push_back("(undecryptable)");
        continue;
      }
      records.push_back(std::regex_replace(*plain, time, "\"time\":\"T\""));
    }
    return records;
  }
  std::vector<std::string> Files() const {
    std::vector<std::string> found;
    for (const auto &entry : std::filesystem::recursive_directory_iterator(base_))
      found.push_back(entry.path().lexically_relative(base_).generic_string().insert(0, 1, '/'));
    std::sort(found.begin(), found.end());
    return found;
  }
};

std::string Rec(const char *type, const char *extra = "", const char *game = "g1", const char *user = "u1") {
  return std::string("{\"user_id\":\"") + user + "\",\"game_id\":\"" + game + "\",\"type\":\"" + type +
         "\",\"time\":\"T\",\"extra\":\"" + extra + "\"}";
}

Message Info(const std::string &type, const char *text) { return {0, "[OrvaneSDK] Analytics " + type + " - " + text}; }
Message Warn(const std::string &type, const char *text) { return {1, "[OrvaneSDK] Analytics " + type + " - " + text}; }
Message Err(const std::string &type, const std::string &text) { return {2, "[OrvaneSDK] Analytics " + type + " - " + text}; }
const Message kInitializeOk{0, "[OrvaneSDK] Initialize() - OK."};
const Message kInitializeFailed{2, "[OrvaneSDK] Initialize() - failed."};

TEST_F(RecorderTest, FirstEventOnANewMachine) {
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  const std::vector<Message> first = {
      Info("ENTER", "SDK was never initialized. Initializing the SDK."), kInitializeOk,
      Warn("ENTER", "log was never initialized. Initialized the game log"), Info("INIT", "OK"),
      Info("ENTER", "OK")};
  EXPECT_EQ(Captured(), first);
  EXPECT_EQ(Records("g1"), (std::vector<std::string>{Rec("INIT"), Rec("ENTER")}));
  const std::string after_enter = *ReadFile(LogPath("g1"));
  EXPECT_EQ(std::count(after_enter.begin(), after_enter.end(), '\n'), 1);
  EXPECT_NE(after_enter.back(), '\n');

  Captured().clear();
  EXPECT_EQ(oAnalyticsInit("g1", "u1"), 0);
  EXPECT_EQ(Captured(), (std::vector<Message>{Warn("INIT", "log had been already initialized.")}));
  EXPECT_EQ(*ReadFile(LogPath("g1")), after_enter);

  Captured().clear();
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", "score=10"), 0);
  EXPECT_EQ(oAnalyticsGameExit("g1", "u1"), 0);
  EXPECT_EQ(Captured(), (std::vector<Message>{Info("SPECIAL", "OK"), Info("EXIT", "OK")}));
  EXPECT_EQ(Records("g1"),
            (std::vector<std::string>{Rec("INIT"), Rec("ENTER"), Rec("SPECIAL", "score=10"), Rec("EXIT")}));
}

TEST_F(RecorderTest, InitStartsAnEmptyLogOnly) {
  struct Case {
    const char *name;
    std::optional<std::string> existing; // nullopt: no file
    std::vector<Message> messages;
    bool writes;
  };
  const Case cases[] = {
      {"new file", std::nullopt, {Info("INIT", "OK")}, true},
      {"existing empty file", std::string(), {Info("INIT", "OK")}, true},
      {"non-empty file", std::string("x"), {Warn("INIT", "log had been already initialized.")}, false},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    std::filesystem::create_directories(where_.logs);
    std::filesystem::remove(LogPath("g1"));
    if (c.existing) WriteFile(LogPath("g1"), *c.existing);
    Captured().clear();
    EXPECT_EQ(oAnalyticsInit("g1", "u1"), 0);
    EXPECT_EQ(Captured(), c.messages);
    if (c.writes) {
      EXPECT_EQ(Records("g1"), std::vector<std::string>{Rec("INIT")});
      EXPECT_EQ(ReadFile(LogPath("g1"))->find('\n'), std::string::npos);
    } else {
      EXPECT_EQ(ReadFile(LogPath("g1")), c.existing);
    }
  }
}

TEST_F(RecorderTest, EveryEventTypeOnAnEmptyLogWritesInitFirst) {
  for (const std::string type : {"ENTER", "EXIT", "SPECIAL"}) {
    SCOPED_TRACE(type);
    std::filesystem::create_directories(where_.logs);
    std::filesystem::remove(LogPath("g1"));
    Captured().clear();
    const int result = type == "ENTER" ? oAnalyticsGameEnter("g1", "u1")
                       : type == "EXIT" ? oAnalyticsGameExit("g1", "u1")
                                        : oAnalyticsSpecial("g1", "u1", "");
    EXPECT_EQ(result, 0);
    EXPECT_EQ(Captured(), (std::vector<Message>{Warn(type, "log was never initialized. Initialized the game log"),
                                                Info("INIT", "OK"), Info(type, "OK")}));
    EXPECT_EQ(Records("g1"), (std::vector<std::string>{Rec("INIT"), Rec(type.c_str())}));
  }
}

TEST_F(RecorderTest, RefusedCallsSendOneErrorAndTouchNothing) {
  struct Case {
    const char *name;
    const char *game;
    const char *user;
    Message message;
  };
  const Case cases[] = {
      {"empty game id", "", "u1", Err("ENTER", "failed. Game id is empty")},
      {"null game id", nullptr, "u1", Err("ENTER", "failed. Game id is empty")},
      {"empty user id", "g1", "", Err("ENTER", "failed. User id is empty")},
      {"null user id", "g1", nullptr, Err("ENTER", "failed. User id is empty")},
      {"both empty: the game id first", "", "", Err("ENTER", "failed. Game id is empty")},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    Captured().clear();
    EXPECT_EQ(oAnalyticsGameEnter(c.game, c.user), -1);
    EXPECT_EQ(Captured(), std::vector<Message>{c.message});
  }
  EXPECT_EQ(Files(), std::vector<std::string>{"/share"});
}

TEST_F(RecorderTest, HostileGameIdsWriteNothingAnywhere) {
  std::filesystem::create_directories(where_.logs);
  // Control bytes are shown as \xNN, so that an id cannot forge lines in the
  // host's own log.
  const std::pair<std::string, std::string> ids[] = {
      {"../x", "../x"}, {"..\\..\\x", "..\\..\\x"}, {"..", ".."}, {".", "."}, {"CON", "CON"},
      {"nul.txt", "nul.txt"}, {"com1", "com1"}, {"a|b", "a|b"}, {"a:b", "a:b"}, {"sub/dir", "sub/dir"},
      {"x.", "x."}, {"x ", "x "}, {"/abs", "/abs"}, {"tab\there\x7f", "tab\\x09here\\x7f"},
      {"x\n[OrvaneSDK] y - OK\x1b[2K", "x\\x0a[OrvaneSDK] y - OK\\x1b[2K"}};
  for (const auto &[id, shown] : ids) {
    SCOPED_TRACE(id);
    Captured().clear();
    EXPECT_EQ(oAnalyticsInit(id.c_str(), "u1"), -1);
    EXPECT_EQ(Captured(),
              std::vector<Message>{Err("INIT", "log file failed to open. Maybe a bad game_id (" + shown + ")?")});
  }
  EXPECT_EQ(Files(), (std::vector<std::string>{"/share", "/share/Orvane", "/share/Orvane/Logs"}));
}

// With the storage missing, a refused game id still initialises first, as any
// event does before its file is opened.
TEST_F(RecorderTest, HostileGameIdOnANewMachine) {
  EXPECT_EQ(oAnalyticsSpecial("../x", "u1", "e"), -1);
  EXPECT_EQ(Captured(), (std::vector<Message>{
                            Info("SPECIAL", "SDK was never initialized. Initializing the SDK."), kInitializeOk,
                            Err("SPECIAL", "log file failed to open. Maybe a bad game_id (../x)?")}));
}

TEST_F(RecorderTest, ValuesAreStoredEscapedAndWhole) {
  const std::string long_extra(5000, 'e');
  ASSERT_EQ(oAnalyticsSpecial("g1", "u\"1", "a\"b\\c\nd\te\x01"), 0);
  ASSERT_EQ(oAnalyticsSpecial("g1", "u\"1", long_extra.c_str()), 0);
  ASSERT_EQ(oAnalyticsSpecial("g1", "u\"1", nullptr), 0);
  EXPECT_EQ(Records("g1"), (std::vector<std::string>{
                               Rec("INIT", "", "g1", "u\\\"1"),
                               Rec("SPECIAL", "a\\\"b\\\\c\\nd\\te\\u0001", "g1", "u\\\"1"),
                               Rec("SPECIAL", long_extra.c_str(), "g1", "u\\\"1"),
                               Rec("SPECIAL", "", "g1", "u\\\"1")}));
}

TEST_F(RecorderTest, NoCallbackSameFiles) {
  oRegisterForLogs(nullptr);
  Captured().clear();
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  EXPECT_EQ(oAnalyticsGameExit("g2", "u2"), 0);
  EXPECT_TRUE(Captured().empty());
  EXPECT_EQ(Records("g1"), (std::vector<std::string>{Rec("INIT"), Rec("ENTER")}));
  EXPECT_EQ(Records("g2"), (std::vector<std::string>{Rec("INIT", "", "g2", "u2"), Rec("EXIT", "", "g2", "u2")}));
}

// Failures injected into single platform and cipher calls.
int g_calls_left; // calls that succeed before the injected failures begin
bool Spend() { return g_calls_left-- > 0; }
const platform::Calls &Os() { return platform::native_calls(); }
platform::FileHandle FailingOpen(const char *path, std::int64_t &size) {
  return Spend() ? Os().open_log(path, size) : platform::kNoFile;
}
// Another process makes the logs directory while this open fails.
platform::FileHandle OpenRacingAnotherProcess(const char *path, std::int64_t &size) {
  const std::filesystem::path logs = std::filesystem::path(path).parent_path();
  if (std::filesystem::exists(logs)) return Os().open_log(path, size);
  std::filesystem::create_directories(logs);
  return platform::kNoFile;
}
platform::FileHandle OpenOfUnknownSize(const char *path, std::int64_t &size) {
  const platform::FileHandle file = Os().open_log(path, size);
  size = -1;
  return file;
}
// A full disk: half the line goes in.
bool ShortAppend(platform::FileHandle f, const void *d, std::size_t n) {
  if (Spend()) return Os().append(f, d, n);
  Os().append(f, d, n / 2);
  return false;
}
bool ThrowingAppend(platform::FileHandle, const void *, std::size_t) { throw std::bad_alloc(); }
bool FailingClose(platform::FileHandle f) { return Os().close_file(f) && Spend(); }
bool FailingMakeDirectory(const char *) { return false; }
platform::FileHandle ThrowingOpen(const char *, std::int64_t &) { throw std::bad_alloc(); }
std::ptrdiff_t FailingEncrypt(cipher::Session *, const std::uint8_t *, std::size_t, std::uint8_t *) { return -1; }
// Another writer holds the lock for longer than the wait; time moves 100 ms
// per reading of the clock, whatever the pauses do.
int g_lock_tries;
std::int64_t g_now_ms;
platform::LockResult BusyLock(platform::FileHandle) { return ++g_lock_tries, platform::LockResult::kBusy; }
std::int64_t FastClock() { return g_now_ms += 100; }
void NoPause(int) {}
// Another writer starts the log while this call waits for the lock.
platform::LockResult RivalStartsTheLog(platform::FileHandle) {
  std::int64_t size = 0;
  const platform::FileHandle rival = Os().open_log((LogsOfThisTest() + "g1.log").c_str(), size);
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
  platform::calls().steady_milliseconds = FastClock;
  platform::calls().sleep_milliseconds = NoPause;
}

TEST_F(RecorderTest, InjectedFailuresAreReportedNeverOk) {
  struct Case {
    const char *name;
    bool initialised;       // the log already holds its INIT line
    void (*inject)();
    int calls_left;
    int result;
    std::vector<Message> messages;
    std::vector<std::string> records; // after the call
  };
  const std::string open_failed = "log file failed to open. Maybe a bad game_id (g1)?";
  const Message not_initialised = Warn("ENTER", "log was never initialized. Initialized the game log");
  const Case cases[] = {
      {"open fails", true, [] { platform::calls().open_log = FailingOpen; }, 0, -1,
       {Err("ENTER", open_failed)}, {Rec("INIT")}},
      {"open fails while another process makes the directory: tried again", false,
       [] {
         std::filesystem::remove_all(LogsOfThisTest());
         platform::calls().open_log = OpenRacingAnotherProcess;
       },
       0, 0, {not_initialised, Info("INIT", "OK"), Info("ENTER", "OK")},
       {Rec("INIT"), Rec("ENTER")}},
      {"write fails: the fragment stays apart", true, [] { platform::calls().append = ShortAppend; }, 0, -1,
       {Err("ENTER", "log file failed to write.")}, {Rec("INIT"), "(undecryptable)"}},
      {"first write fails: cut back, no INIT-less log", false, [] { platform::calls().append = ShortAppend; }, 0,
       -1, {not_initialised, Err("INIT", "log file failed to write."), Err("ENTER", "log file failed to write.")},
       {}},
      {"close fails", true, [] { platform::calls().close_file = FailingClose; }, 0, -1,
       {Err("ENTER", "log file failed to write.")}, {Rec("INIT"), Rec("ENTER")}},
      {"cipher fails", true, [] { cipher::backend().encrypt = FailingEncrypt; }, 0, -1,
       {Err("ENTER", "failed. Record encryption failed.")}, {Rec("INIT")}},
      {"size unknown counts as not empty", false, [] { platform::calls().open_log = OpenOfUnknownSize; }, 0, 0,
       {Info("ENTER", "OK")}, {"(undecryptable)", Rec("ENTER")}},
      {"empty log locked by another writer past the deadline", false,
       [] { InjectBusyLock(BusyLock); }, 0, -1, {Err("ENTER", "log file is locked by another process.")}, {}},
      {"another writer starts the log during the wait: measured again, one line break", false,
       [] { InjectBusyLock(RivalStartsTheLog); }, 0, 0, {Info("ENTER", "OK")}, {"(undecryptable)", Rec("ENTER")}},
      {"another writer starts the log before the lock is had: measured again", false,
       [] { InjectBusyLock(RivalStartsTheLogThenYields); }, 0, 0, {Info("ENTER", "OK")},
       {"(undecryptable)", Rec("ENTER")}},
      {"an exception inside the call", true, [] { platform::calls().open_log = ThrowingOpen; }, 0, -1,
       {Err("ENTER", "failed. Internal error.")}, {Rec("INIT")}},
      {"an exception under the lock gives the lock back", false,
       [] { platform::calls().append = ThrowingAppend; }, 0, -1,
       {not_initialised, Err("ENTER", "failed. Internal error.")}, {}},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    std::filesystem::create_directories(where_.logs);
    std::filesystem::remove(LogPath("g1"));
    if (c.initialised) {
      ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
    }
    Captured().clear();
    g_logs_of_this_test = where_.logs;
    c.inject();
    g_calls_left = c.calls_left;
    g_lock_tries = 0;
    EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), c.result);
    platform::calls() = platform::native_calls();
    cipher::backend() = cipher::native_backend();
    EXPECT_EQ(Captured(), c.messages);
    EXPECT_EQ(Records("g1"), c.records);
    EXPECT_LE(g_lock_tries, 11) << "the wait is bounded by time, not by tries";
    // The recorder is whole again: the next event goes through.
    Captured().clear();
    EXPECT_EQ(oAnalyticsGameExit("g1", "u1"), 0);
    EXPECT_EQ(Captured().back(), Info("EXIT", "OK"));
  }
}

TEST_F(RecorderTest, RecordTooLargeIsRefusedBeforeAnythingIsWritten) {
  ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
  Captured().clear();
  EXPECT_EQ(oAnalyticsSpecial("g1", "u1", std::string(std::size_t{32} << 20, 'x').c_str()), -1);
  EXPECT_EQ(Captured(), (std::vector<Message>{Err("SPECIAL", "failed. Record too large.")}));
  EXPECT_EQ(Records("g1"), std::vector<std::string>{Rec("INIT")});
}

TEST_F(RecorderTest, StorageThatCannotBeCreated) {
  platform::calls().make_directory = FailingMakeDirectory;
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), -1);
  EXPECT_EQ(Captured(), (std::vector<Message>{Info("ENTER", "SDK was never initialized. Initializing the SDK."),
                                              kInitializeFailed,
                                              Err("ENTER", "log file failed to open. Maybe a bad game_id (g1)?")}));
}

TEST_F(RecorderTest, LogsDirectoryReplacedByAFileBetweenCalls) {
  ASSERT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  std::filesystem::remove_all(where_.logs);
  WriteFile(where_.root + "Logs", "in the way");
  Captured().clear();
  EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), -1);
  EXPECT_EQ(Captured(), (std::vector<Message>{Info("ENTER", "SDK was never initialized. Initializing the SDK."),
                                              kInitializeFailed,
                                              Err("ENTER", "log file failed to open. Maybe a bad game_id (g1)?")}));
}

TEST_F(RecorderTest, PresentDirectoryIsNotInitialisedAgain) {
  std::filesystem::create_directories(where_.logs);
  EXPECT_EQ(oAnalyticsInit("g1", "u1"), 0);
  EXPECT_EQ(oAnalyticsInit("g2", "u1"), 0);
  EXPECT_EQ(Captured(), (std::vector<Message>{Info("INIT", "OK"), Info("INIT", "OK")}));
}

} // namespace
} // namespace orvane::testing
