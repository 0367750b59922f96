// The event recorder through the four analytics exports: messages in order,
// results, and the exact bytes of the log file.
#include "OrvaneSDK.h"
#include "analytics/cipher.h"
#include "analytics/record_cipher.h"
#include "support/test_support.h"

#include <filesystem>
#include <new>
#include <regex>
#include <string>
#include <vector>

namespace orvane::testing {
namespace {

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
    if (!content) return records;
    const KeyBlock &block = GetKeyBlock();
    const std::string key(block.keyText.begin(), block.keyText.end());
    static const std::regex time(R"("time":"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d")");
    for (const std::string &line : SplitLogLines(*content)) {
      std::optional<std::string> plain = DecryptLine(line, key);
      if (!plain) {
        records.push_back("(undecryptable: " + line + ")");
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
  const std::string ids[] = {"../x", "..\\..\\x", "..", ".", "CON", "nul.txt", "com1", "a|b",
                             "a:b", "sub/dir", "x.", "x ", "tab\there", "/abs"};
  for (const std::string &id : ids) {
    SCOPED_TRACE(id);
    Captured().clear();
    EXPECT_EQ(oAnalyticsInit(id.c_str(), "u1"), -1);
    EXPECT_EQ(Captured(),
              std::vector<Message>{Err("INIT", "log file failed to open. Maybe a bad game_id (" + id + ")?")});
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
int g_calls_left; // calls that succeed before the one injected failure
bool Spend() { return g_calls_left-- != 0; }
platform::FileHandle FailingOpen(const char *path) {
  return Spend() ? platform::native_calls().open_append(path) : platform::kNoFile;
}
bool FailingAppend(platform::FileHandle f, const void *d, std::size_t n) {
  return Spend() && platform::native_calls().append(f, d, n);
}
bool FailingClose(platform::FileHandle f) { return platform::native_calls().close_file(f) && Spend(); }
std::int64_t FailingSize(platform::FileHandle) { return -1; }
bool FailingMakeDirectory(const char *) { return false; }
bool FailingLock(platform::FileHandle) { return false; }
platform::FileHandle ThrowingOpen(const char *) { throw std::bad_alloc(); }
std::ptrdiff_t FailingEncrypt(cipher::Session *, const std::uint8_t *, std::size_t, std::uint8_t *) { return -1; }

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
  const Case cases[] = {
      {"open fails", true, [] { platform::calls().open_append = FailingOpen; }, 0, -1,
       {Err("ENTER", open_failed)}, {Rec("INIT")}},
      {"write fails", true, [] { platform::calls().append = FailingAppend; }, 0, -1,
       {Err("ENTER", "log file failed to write.")}, {Rec("INIT")}},
      {"close fails", true, [] { platform::calls().close_file = FailingClose; }, 0, -1,
       {Err("ENTER", "log file failed to write.")}, {Rec("INIT"), Rec("ENTER")}},
      {"cipher fails", true, [] { cipher::backend().encrypt = FailingEncrypt; }, 0, -1,
       {Err("ENTER", "failed. Record encryption failed.")}, {Rec("INIT")}},
      {"size unknown counts as not empty", false, [] { platform::calls().file_size = FailingSize; }, 0, 0,
       {Info("ENTER", "OK")}, {"(undecryptable: )", Rec("ENTER")}},
      {"lock unavailable: goes on without it", false, [] { platform::calls().lock_file = FailingLock; }, 0, 0,
       {Warn("ENTER", "log was never initialized. Initialized the game log"), Info("INIT", "OK"),
        Info("ENTER", "OK")},
       {Rec("INIT"), Rec("ENTER")}},
      {"nested INIT write fails, the event still goes in", false,
       [] { platform::calls().append = FailingAppend; }, 0, 0,
       {Warn("ENTER", "log was never initialized. Initialized the game log"),
        Err("INIT", "log file failed to write."), Info("ENTER", "OK")},
       {"(undecryptable: )", Rec("ENTER")}},
      {"nested INIT open fails", false, [] { platform::calls().open_append = FailingOpen; }, 1, 0,
       {Warn("ENTER", "log was never initialized. Initialized the game log"), Err("INIT", open_failed),
        Info("ENTER", "OK")},
       {"(undecryptable: )", Rec("ENTER")}},
      {"an exception inside the call", true, [] { platform::calls().open_append = ThrowingOpen; }, 0, -1,
       {Err("ENTER", "failed. Internal error.")}, {Rec("INIT")}},
  };
  for (const Case &c : cases) {
    SCOPED_TRACE(c.name);
    std::filesystem::create_directories(where_.logs);
    std::filesystem::remove(LogPath("g1"));
    if (c.initialised) {
      ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
    }
    Captured().clear();
    c.inject();
    g_calls_left = c.calls_left;
    EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), c.result);
    platform::calls() = platform::native_calls();
    cipher::backend() = cipher::native_backend();
    EXPECT_EQ(Captured(), c.messages);
    EXPECT_EQ(Records("g1"), c.records);
    // The recorder is whole again: the next event goes through.
    Captured().clear();
    EXPECT_EQ(oAnalyticsGameExit("g1", "u1"), 0);
    EXPECT_EQ(Captured().back(), Info("EXIT", "OK"));
  }
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
