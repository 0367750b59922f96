// Windows rules that no Linux test can see: the platform layer.
#include "support/test_support.h"

namespace orvane::testing {
namespace {

using WindowsTest = SandboxTest;

// Every storage directory ends in a backslash, for which msvcrt's _stat
// fails: built on it, every event would initialise the SDK again.
TEST_F(WindowsTest, DirectoryExistsWithOrWithoutTrailingSeparator) {
  ASSERT_TRUE(os.make_private_directories((base_ + "\\dir").c_str()));
  WriteFile(base_ + "\\file", "x");
  const std::pair<const char *, bool> cases[] = {{"\\dir", true},   {"\\dir\\", true},   {"/dir/", true},
                                                 {"\\file", false}, {"\\file\\", false}, {"\\none\\", false}};
  for (const auto &[path, exists] : cases)
    EXPECT_EQ(os.directory_exists((base_ + path).c_str()), exists) << path;
}

// A device or a directory is no log. Two handles of one log, as two games hold
// them, both shared; a conversion gives the shared lock up first. Windows'
// byte-range locks are mandatory, yet the lock must not stop an append, and a
// torn line is cut back through an append-only handle (wine enforces neither
// rule, so only real Windows sees those two faults).
TEST_F(WindowsTest, LogHandles) {
  const std::string path = base_ + "\\two.log";
  std::int64_t size = -1;
  platform::LockResult lock[2];
  EXPECT_EQ(os.open_log("NUL", lock[0], size), platform::kNoFile) << "a device is no log";
  EXPECT_EQ(os.open_log(base_.c_str(), lock[0], size), platform::kNoFile) << "a directory is no log";
  const platform::FileHandle one = os.open_log(path.c_str(), lock[0], size),
                             two = os.open_log(path.c_str(), lock[1], size);
  ASSERT_TRUE(one != platform::kNoFile && two != platform::kNoFile);
  using platform::LockMode;
  const platform::LockResult locked = platform::LockResult::kLocked, busy = platform::LockResult::kBusy;
  EXPECT_EQ(os.try_lock_file(one, LockMode::kExclusive), busy);
  EXPECT_EQ(os.try_lock_file(two, LockMode::kExclusive), locked) << "the failed conversion held none";
  EXPECT_TRUE(os.append(two, "ab", 2) && os.append(one, "cd", 2)); // "cd" behind "ab", not over it
  os.unlock_file(two);
  EXPECT_EQ(os.try_lock_file(one, LockMode::kShared), locked);
  EXPECT_TRUE(os.truncate_file(one, 3));
  EXPECT_EQ(ReadFile(path), "abc");
  EXPECT_TRUE(os.close_file(one) && os.close_file(two));
}

} // namespace
} // namespace orvane::testing
