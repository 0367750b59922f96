// The Windows platform layer against the Windows file system.
#include "OrvaneSDK.h"
#include "platform/platform.h"
#include "analytics/record_cipher.h"
#include "core/storage.h"
#include "support/test_support.h"

#include <windows.h>

#include <ctime>
#include <string>
#include <thread>
#include <vector>

namespace orvane::testing {
namespace {

// Storage laid out as on a real machine: backslashes, and both directories
// ending in one, below a private temporary base.
class WindowsStorageTest : public SandboxTest {
protected:
  void SetUp() override {
    SandboxTest::SetUp();
    for (char &c : base_)
      if (c == '/') c = '\\';
    where_.base = base_;
    where_.root = base_ + "\\Orvane\\";
    where_.logs = where_.root + "Logs\\";
    SetStorageForTesting(where_);
  }
  std::string Path(const char *name) const { return base_ + "\\" + name; }
};

TEST_F(WindowsStorageTest, DirectoryExistsWithOrWithoutTrailingSeparator) {
  ASSERT_TRUE(::CreateDirectoryA(Path("dir").c_str(), nullptr));
  WriteFile(Path("file"), "x");
  struct Case {
    std::string path;
    bool exists;
  };
  const Case cases[] = {
      {Path("dir"), true},         {Path("dir") + "\\", true}, {Path("dir") + "/", true},
      {base_ + "/dir/", true},     {Path("file"), false},      {Path("file") + "\\", false},
      {Path("missing"), false},    {Path("missing") + "\\", false},
      {Path("dir\\missing\\"), false},
  };
  const platform::Calls &os = platform::native_calls();
  for (const Case &c : cases) EXPECT_EQ(os.directory_exists(c.path.c_str()), c.exists) << c.path;
}

// The runtime's _stat fails for "...\Logs\"; were the directory test built on
// it, every event would find the SDK uninitialised and initialise it again.
TEST_F(WindowsStorageTest, SecondEventFindsTheSdkInitialised) {
  ASSERT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  ASSERT_TRUE(IsDirectory(where_.logs));
  Captured().clear();
  ASSERT_EQ(oAnalyticsGameExit("g1", "u1"), 0);
  const std::vector<Message> expected = {{0, "[OrvaneSDK] Analytics EXIT - OK"}};
  EXPECT_EQ(Captured(), expected);
  Captured().clear();
  oInitialize();
  const std::vector<Message> again = {{0, "[OrvaneSDK] Initialize() - OK."}};
  EXPECT_EQ(Captured(), again);
}

TEST_F(WindowsStorageTest, LinesAreSeparatedByCrLf) {
  ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
  ASSERT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
  ASSERT_EQ(oAnalyticsSpecial("g1", "u1", "score=10"), 0);
  const std::string content = *ReadFile(where_.logs + "g1.log");
  // Three lines with CR LF between them, no lone CR or LF, none at the end.
  std::vector<std::string> lines;
  for (std::size_t start = 0;;) {
    const std::size_t end = content.find("\r\n", start);
    lines.push_back(content.substr(start, end == std::string::npos ? end : end - start));
    if (end == std::string::npos) break;
    start = end + 2;
  }
  ASSERT_EQ(lines.size(), 3u) << content;
  for (const std::string &line : lines) {
    EXPECT_EQ(line.find_first_of("\r\n"), std::string::npos) << line;
    EXPECT_FALSE(line.empty());
  }
  const std::string key = KeyTextFor("g1");
  const std::string first = DecryptLine(lines[0], key).value_or("");
  const std::string last = DecryptLine(lines[2], key).value_or("");
  EXPECT_NE(first.find("\"type\":\"INIT\""), std::string::npos) << first;
  EXPECT_NE(last.find("\"extra\":\"score=10\""), std::string::npos) << last;
}

// Threads record at once, each with its own CNG session: every line
// decrypts and none is lost. (Each thread keeps to its own log: wine makes an
// append of one handle a seek and a write, so two handles of one file can
// overwrite each other's lines there, which Windows does not.)
TEST_F(WindowsStorageTest, ThreadsRecordAtOnce) {
  constexpr int kThreads = 4, kEvents = 40;
  std::vector<std::thread> threads;
  for (int t = 0; t < kThreads; ++t)
    threads.emplace_back([t] {
      const std::string own = "own" + std::to_string(t);
      for (int i = 0; i < kEvents; ++i) EXPECT_EQ(oAnalyticsGameEnter(own.c_str(), "u1"), 0);
    });
  for (std::thread &thread : threads) thread.join();
  const KeyBlock &block = GetKeyBlock();
  const std::string key(block.keyText.begin(), block.keyText.end());
  for (int t = 0; t < kThreads; ++t) {
    const std::vector<std::string> lines = SplitLogLines(*ReadFile(where_.logs + "own" + std::to_string(t) + ".log"));
    EXPECT_EQ(lines.size(), 1u + kEvents);
    for (const std::string &line : lines) EXPECT_TRUE(DecryptLine(line, key).has_value()) << t;
  }
}

TEST_F(WindowsStorageTest, MissingLevelsAreCreated) {
  const std::string deep = Path("a\\b\\c");
  const platform::Calls &os = platform::native_calls();
  EXPECT_TRUE(os.make_private_directories(deep.c_str()));
  EXPECT_TRUE(IsDirectory(deep));
  EXPECT_TRUE(os.make_private_directories(deep.c_str())); // already there
  WriteFile(Path("plain"), "x");
  EXPECT_FALSE(os.make_private_directories(Path("plain\\d").c_str()));
}

// Two handles on one log, as the nested INIT run holds them: every write
// lands at the end of the file, whatever the other handle wrote meanwhile,
// and the file stays open to readers and to deletion.
TEST_F(WindowsStorageTest, AppendsOfTwoHandlesLandAtTheEnd) {
  const platform::Calls &os = platform::native_calls();
  const std::string path = Path("shared.log");
  std::int64_t size = -1;
  const platform::FileHandle outer = os.open_log(path.c_str(), size);
  ASSERT_NE(outer, platform::kNoFile);
  EXPECT_EQ(size, 0);
  const platform::FileHandle inner = os.open_log(path.c_str(), size);
  ASSERT_NE(inner, platform::kNoFile);
  EXPECT_TRUE(os.append(inner, "first", 5));
  EXPECT_TRUE(os.close_file(inner));
  EXPECT_TRUE(os.append(outer, "\r\nsecond", 8));
  EXPECT_EQ(os.file_size(outer), 13);
  // A torn first line is cut back through the append-only handle.
  EXPECT_TRUE(os.truncate_file(outer, 5));
  EXPECT_EQ(os.file_size(outer), 5);

  const HANDLE reader = ::CreateFileA(path.c_str(), GENERIC_READ, FILE_SHARE_READ | FILE_SHARE_WRITE,
                                      nullptr, OPEN_EXISTING, 0, nullptr);
  EXPECT_NE(reader, INVALID_HANDLE_VALUE) << "a reader is shut out";
  if (reader != INVALID_HANDLE_VALUE) ::CloseHandle(reader);
  EXPECT_TRUE(os.close_file(outer));
  EXPECT_EQ(ReadFile(path), "first");

  const platform::FileHandle held = os.open_log(path.c_str(), size);
  ASSERT_NE(held, platform::kNoFile);
  EXPECT_TRUE(::DeleteFileA(path.c_str())) << "deletion is refused while a log is open";
  EXPECT_TRUE(os.close_file(held));
  EXPECT_FALSE(Exists(path));
}

// The lock is a token between writers: a second handle cannot take it while
// it is held and gets it once released, and it never stands in the way of
// an append, although Windows byte-range locks are mandatory.
TEST_F(WindowsStorageTest, LockShutsOutLockersButNotWriters) {
  const platform::Calls &os = platform::native_calls();
  const std::string path = Path("locked.log");
  std::int64_t size = -1;
  const platform::FileHandle first = os.open_log(path.c_str(), size);
  const platform::FileHandle second = os.open_log(path.c_str(), size);
  ASSERT_NE(first, platform::kNoFile);
  ASSERT_NE(second, platform::kNoFile);
  ASSERT_EQ(os.try_lock_file(first), platform::LockResult::kLocked);
  EXPECT_EQ(os.try_lock_file(second), platform::LockResult::kBusy);
  EXPECT_TRUE(os.append(second, "a", 1));
  EXPECT_TRUE(os.append(first, "b", 1));
  os.unlock_file(first);
  EXPECT_EQ(os.try_lock_file(second), platform::LockResult::kLocked);
  os.unlock_file(second);
  EXPECT_TRUE(os.close_file(first));
  EXPECT_TRUE(os.close_file(second));
  EXPECT_EQ(ReadFile(path), "ab");
}

TEST_F(WindowsStorageTest, FailuresOfTheFileCalls) {
  const platform::Calls &os = platform::native_calls();
  std::int64_t size = -1;
  EXPECT_EQ(os.open_log(Path("missing\\x.log").c_str(), size), platform::kNoFile);
  EXPECT_EQ(os.open_log(Path("a|b.log").c_str(), size), platform::kNoFile);
  ASSERT_TRUE(::CreateDirectoryA(Path("dir.log").c_str(), nullptr));
  EXPECT_EQ(os.open_log(Path("dir.log").c_str(), size), platform::kNoFile);
  EXPECT_EQ(os.open_log("NUL", size), platform::kNoFile) << "a device is no log";
}

TEST(WindowsClock, SecondsSince1970) {
  FILETIME now;
  ::GetSystemTimeAsFileTime(&now);
  // 100 ns units since 1601-01-01; 11644473600 s lie between the two epochs.
  const std::int64_t ticks =
      (static_cast<std::int64_t>(now.dwHighDateTime) << 32) | now.dwLowDateTime;
  const std::int64_t expected = ticks / 10000000 - 11644473600LL;
  const std::int64_t got = platform::native_calls().now_seconds();
  EXPECT_LE(expected - 1, got);
  EXPECT_LE(got, expected + 2);
}

TEST(WindowsStorageLocation, FixedMachineWidePaths) {
  const platform::StorageLocation where = platform::default_storage_location();
  EXPECT_EQ(where.base, "");
  EXPECT_EQ(where.root, "C:\\Orvane\\");
  EXPECT_EQ(where.logs, "C:\\Orvane\\Logs\\");
  EXPECT_EQ(platform::line_break(), "\r\n");
}

} // namespace
} // namespace orvane::testing
