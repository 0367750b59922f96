// A real full disk: the file-size limit makes the kernel refuse the write.
#include "OrvaneSDK.h"
#include "support/test_support.h"

#include <csignal>
#include <filesystem>
#include <sys/resource.h>

namespace orvane::testing {
namespace {

class DiskFullTest : public SandboxTest {};

TEST_F(DiskFullTest, ALineThatDoesNotFitIsAnErrorNotOk) {
  std::filesystem::create_directories(where_.logs);
  ASSERT_EQ(oAnalyticsInit("g1", "u1"), 0);
  const std::string before = *ReadFile(LogPath("g1"));

  rlimit saved;
  ASSERT_EQ(::getrlimit(RLIMIT_FSIZE, &saved), 0);
  auto previous = std::signal(SIGXFSZ, SIG_IGN);
  rlimit full = saved;
  full.rlim_cur = before.size(); // not one byte more fits
  ASSERT_EQ(::setrlimit(RLIMIT_FSIZE, &full), 0);
  Captured().clear();
  const int result = oAnalyticsGameEnter("g1", "u1");
  ::setrlimit(RLIMIT_FSIZE, &saved);
  std::signal(SIGXFSZ, previous);

  EXPECT_EQ(result, -1);
  EXPECT_EQ(Captured(), (std::vector<Message>{{2, "[OrvaneSDK] Analytics ENTER - log file failed to write."}}));
  EXPECT_EQ(*ReadFile(LogPath("g1")), before);
}

} // namespace
} // namespace orvane::testing
