// What only POSIX systems have: file modes, links, FIFOs, thread
// cancellation, short writes, file locks, and where the files go.
#include "OrvaneSDK.h"
#include "support/test_support.h"

#include <atomic>
#include <csignal>
#include <fcntl.h>
#include <filesystem>
#include <malloc.h>
#include <pthread.h>
#include <pwd.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

namespace orvane::testing {
namespace {

using PosixTest = SandboxTest;

mode_t ModeOf(const std::string &path) {
  struct stat st;
  return ::stat(path.c_str(), &st) == 0 ? st.st_mode & 07777 : 0;
}

// Owner-only whatever the umask: no other user may plant links or FIFOs where
// the logs go, or read logs whose key follows from their names; modes are
// set after the umask narrowed them, and our folders left so are mended.
// Anything but a regular file at a log path is refused at once: a FIFO would
// hang the game, a link would let it write anywhere the game may, a device is
// no log.
TEST_F(PosixTest, OnlyTheOwnersRegularFileIsALog) {
  // A umask, and a folder that an earlier run left at 0600.
  const std::pair<mode_t, std::string> cases[] = {
      {0, ""}, {0177, ""}, {0277, ""}, {0077, where_.root}, {0077, where_.logs}};
  const std::string levels[] = {base_ + "/home", where_.base, where_.root, where_.logs};
  for (const auto &[umask, left_broken] : cases) {
    const CallsGuard restore;
    platform::calls().open_log = [](const char *path, platform::LockResult &lock, std::int64_t &size) {
      const std::string logs = std::filesystem::path(path).parent_path(); // as for other users than root
      return ModeOf(logs) & S_IXUSR ? os.open_log(path, lock, size) : platform::kNoFile;
    };
    RemoveTree(levels[0]);
    const mode_t saved = ::umask(umask);
    if (!left_broken.empty() && std::filesystem::create_directories(left_broken))
      ::chmod(left_broken.c_str(), 0600);
    EXPECT_EQ(oAnalyticsGameEnter("g1", "u1"), 0);
    ::umask(saved);
    for (const std::string &dir : levels) EXPECT_EQ(ModeOf(dir), 0700u) << dir << " " << umask << left_broken;
    EXPECT_EQ(ModeOf(LogPath("g1")), 0600u) << umask;
  }
  WriteFile(base_ + "/outside", "kept");
  ASSERT_EQ(::mkfifo(LogPath("fifo").c_str(), 0600) | ::mkfifo(LogPath("lonely").c_str(), 0600), 0);
  std::filesystem::create_symlink(base_ + "/outside", LogPath("link"));
  std::filesystem::create_symlink(base_ + "/planted", LogPath("dangling"));
  const auto open_files = [] {
    return std::distance(std::filesystem::directory_iterator("/proc/self/fd"), {});
  };
  // With a reader a FIFO opens at once, so only its type tells it from a log; without, opening must not wait.
  const int reader = ::open(LogPath("fifo").c_str(), O_RDONLY | O_NONBLOCK);
  const auto before = open_files();
  for (const std::string &path :
       {LogPath("fifo"), LogPath("lonely"), LogPath("link"), LogPath("dangling"), std::string("/dev/null")}) {
    platform::LockResult lock;
    std::int64_t size;
    EXPECT_EQ(os.open_log(path.c_str(), lock, size), platform::kNoFile) << path;
  }
  EXPECT_EQ(open_files(), before) << "a refused log leaves no descriptor open";
  ::close(reader);
  EXPECT_EQ(ReadFile(base_ + "/outside"), "kept");
  EXPECT_FALSE(std::filesystem::exists(base_ + "/planted"));
}

// A game may cancel a thread that is inside a call: the call runs to its
// end; a deferred cancellation acts at the thread's next cancellation point,
// an asynchronous one as the call gives the thread's setting back. A child
// forked meanwhile waits for no delivery of the parent's other threads.
std::atomic<int> g_stage{0};
int g_cancel_type;
void ORVANE_CALL WaitInsideCallback(LogLevel, const char *message) {
  if (std::string_view(message).find("Analytics") == std::string_view::npos) return;
  g_stage = 1;
  while (g_stage != 2) ::usleep(1000); // a cancellation point
}
void *RecordOnce(void *) {
  pthread_setcanceltype(g_cancel_type, nullptr);
  g_stage = 3 + oAnalyticsInit("g1", "u1");
  pthread_testcancel();
  return nullptr;
}

TEST_F(PosixTest, CancellingACallingThreadWaitsForTheCall) {
  std::filesystem::create_directories(where_.logs); // one message from the library: "INIT - OK"
  oRegisterForLogs(WaitInsideCallback);
  for (const int type : {PTHREAD_CANCEL_DEFERRED, PTHREAD_CANCEL_ASYNCHRONOUS}) {
    g_cancel_type = type;
    pthread_t thread;
    ASSERT_EQ(pthread_create(&thread, nullptr, RecordOnce, nullptr), 0);
    while (g_stage != 1) ::usleep(1000);
    if (const pid_t child = ::fork(); child == 0) {
      ::alarm(10); // ends a hung child
      oRegisterForLogs(nullptr);
      ::_exit(0);
    } else {
      int status = 0;
      ::waitpid(child, &status, 0);
      EXPECT_TRUE(WIFEXITED(status)) << "the forked child hung";
    }
    pthread_cancel(thread);
    g_stage = 2;
    void *outcome = nullptr;
    pthread_join(thread, &outcome);
    EXPECT_EQ(outcome, PTHREAD_CANCELED) << type;
    EXPECT_EQ(g_stage, type == PTHREAD_CANCEL_DEFERRED ? 3 : 2) << "the call returned";
    EXPECT_NE(ReadFile(LogPath("g1")).value_or(""), "") << type;
  }
}

// The platform layer on real files: a full disk takes part of a write, and
// the platform says so; the lock belongs to the open file, so a second open of
// the same log, as another thread or process has, finds it busy until it is
// given back; the steady clock of the lock's deadline moves with the pauses.
TEST_F(PosixTest, PlatformCallsOnRealFiles) {
  std::filesystem::create_directories(where_.logs);
  std::int64_t size = -1;
  platform::LockResult lock[2];
  const platform::FileHandle first = os.open_log(LogPath("g1").c_str(), lock[0], size),
                             second = os.open_log(LogPath("g1").c_str(), lock[1], size);
  rlimit saved;
  ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &saved), 0);
  rlimit full = saved;
  full.rlim_cur = 4;
  const auto previous = std::signal(SIGXFSZ, SIG_IGN);
  ::setrlimit(RLIMIT_FSIZE, &full);
  EXPECT_FALSE(os.append(first, "0123456789", 10));
  ::setrlimit(RLIMIT_FSIZE, &saved);
  std::signal(SIGXFSZ, previous);
  EXPECT_EQ(os.file_size(first), 4);
  EXPECT_EQ(os.try_lock_file(first, platform::LockMode::kExclusive), platform::LockResult::kBusy);
  EXPECT_EQ(os.try_lock_file(second, platform::LockMode::kExclusive), platform::LockResult::kLocked)
      << "a failed conversion holds none";
  os.unlock_file(second);
  EXPECT_EQ(os.try_lock_file(first, platform::LockMode::kShared), platform::LockResult::kLocked);
  EXPECT_TRUE(os.close_file(first) && os.close_file(second));
  const std::int64_t before = os.steady_milliseconds();
  os.sleep_milliseconds(30);
  EXPECT_GE(os.steady_milliseconds() - before, 25);
}

// Buffers that one large call grew past 1 MiB are given back when it ends
// (measured by glibc; a sanitizer's allocator reports nothing here).
TEST_F(PosixTest, LargeEventsGiveTheirBuffersBack) {
  ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
  const auto in_use = [] {
    const struct mallinfo2 heap = ::mallinfo2();
    return heap.uordblks + heap.hblkhd;
  };
  const std::string large(std::size_t{3} << 19, 'x'); // 1.5 MiB records, 3 MiB lines, the INIT line's too
  const std::size_t before = in_use();
  EXPECT_EQ(oAnalyticsGameEnter("g2", large.c_str()), 0);
  EXPECT_EQ(oAnalyticsGameEnter(large.c_str(), "u1"), -1); // a path no file may have
  EXPECT_LT(in_use(), before + (std::size_t{1} << 19));
}

// Where the files go on POSIX: XDG_DATA_HOME when absolute, else an absolute
// $HOME/.local/share, else the account's home directory. (Each test runs in
// a process of its own, so the environment is not put back.)
TEST(StorageLocation, FollowsTheEnvironment) {
  const std::string account = ::getpwuid(::getuid())->pw_dir;
  const struct {
    const char *xdg, *home;
    std::string logs;
  } cases[] = {{"/data/x/", "/home/u", "/data/x/Orvane/Logs/"},
               {"relative/x", "/home/u", "/home/u/.local/share/Orvane/Logs/"},
               {nullptr, "relative", account + "/.local/share/Orvane/Logs/"},
               {nullptr, nullptr, account + "/.local/share/Orvane/Logs/"}};
  for (const auto &c : cases) {
    c.xdg ? ::setenv("XDG_DATA_HOME", c.xdg, 1) : ::unsetenv("XDG_DATA_HOME");
    c.home ? ::setenv("HOME", c.home, 1) : ::unsetenv("HOME");
    const platform::StorageLocation where = platform::default_storage_location();
    EXPECT_EQ(where.logs, c.logs) << (c.xdg ? c.xdg : "no XDG_DATA_HOME") << ", "
                                  << (c.home ? c.home : "no HOME");
  }
}

} // namespace
} // namespace orvane::testing
