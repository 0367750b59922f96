// Storage location and modes on POSIX.
#include "OrvaneSDK.h"
#include "sdk/storage.h"
#include "support/test_support.h"

#include <cstdlib>
#include <string>
#include <sys/stat.h>

namespace orvane::testing {
namespace {

class StoragePosixTest : public SandboxTest {};

TEST_F(StoragePosixTest, MissingBaseIsCreatedOwnerOnly) {
  oInitialize();
  struct stat st;
  ASSERT_EQ(::stat(where_.base.c_str(), &st), 0);
  EXPECT_EQ(st.st_mode & 0777, 0700u);
}

// Where the files go on POSIX: XDG_DATA_HOME when absolute, else
// $HOME/.local/share.
TEST(StorageLocation, FollowsTheEnvironment) {
  struct Case {
    const char *xdg;
    const char *home;
    std::string root;
  };
  const Case cases[] = {
      {"/data/x", "/home/u", "/data/x/Orvane/"},
      {"/data/x/", "/home/u", "/data/x/Orvane/"},
      {"relative/x", "/home/u", "/home/u/.local/share/Orvane/"},
      {"", "/home/u", "/home/u/.local/share/Orvane/"},
      {nullptr, "/home/v", "/home/v/.local/share/Orvane/"},
  };
  const char *saved_xdg = std::getenv("XDG_DATA_HOME");
  const char *saved_home = std::getenv("HOME");
  std::string xdg_copy = saved_xdg ? saved_xdg : "", home_copy = saved_home ? saved_home : "";
  for (const Case &c : cases) {
    if (c.xdg) ::setenv("XDG_DATA_HOME", c.xdg, 1); else ::unsetenv("XDG_DATA_HOME");
    ::setenv("HOME", c.home, 1);
    platform::StorageLocation where = platform::default_storage_location();
    EXPECT_EQ(where.root, c.root) << (c.xdg ? c.xdg : "(unset)");
    EXPECT_EQ(where.logs, c.root + "Logs/");
  }
  if (saved_xdg) ::setenv("XDG_DATA_HOME", xdg_copy.c_str(), 1); else ::unsetenv("XDG_DATA_HOME");
  if (saved_home) ::setenv("HOME", home_copy.c_str(), 1); else ::unsetenv("HOME");
}

} // namespace
} // namespace orvane::testing
