// Threads recording into the same logs at once: no line lost, torn or glued,
// and one INIT line first in each log (with no extra, though a SPECIAL event
// with one wrote it). Registering while others deliver is the channel's test.
#include "OrvaneSDK.h"
#include "analytics/record_cipher.h"
#include "support/test_support.h"

#include <set>
#include <thread>

namespace orvane::testing {
namespace {

TEST_F(SandboxTest, ThreadsShareLogs) {
  constexpr int kThreads = 4, kEvents = 100; // every other event of a thread goes to its own log
  std::multiset<std::string> expected, shared;
  std::vector<std::thread> running;
  oRegisterForLogs(Ignore); // heard on every thread: the capture is not shared
  for (int t = 0; t < kThreads; ++t)
    running.emplace_back([t] {
      for (int i = 0; i < kEvents; ++i) {
        const std::string game = i % 2 ? "own-" + std::to_string(t) : "shared",
                          tag = game + "/" + std::to_string(i);
        EXPECT_EQ(oAnalyticsSpecial(game.c_str(), "u1", tag.c_str()), 0);
      }
    });
  for (int t = 0; t < kThreads; ++t)
    for (int i = 0; i < kEvents; i += 2) expected.insert("shared/" + std::to_string(i));
  for (std::thread &thread : running) thread.join();
  const KeyText &first = TakeKeyText(nullptr); // the first event's
  const std::string key(first.begin(), first.end());
  for (int t = 0; t <= kThreads; ++t) {
    const std::string game = t < kThreads ? "own-" + std::to_string(t) : "shared";
    const std::vector<std::string> records = Records(LogPath(game), key);
    ASSERT_EQ(records.size(), 1u + (t < kThreads ? kEvents / 2 : expected.size())) << game;
    EXPECT_EQ(records[0],
              R"({"user_id":"u1","game_id":")" + game + R"(","type":"INIT","time":"T","extra":""})");
    for (std::size_t i = 1; i < records.size() && t == kThreads; ++i) {
      const std::size_t start = records[i].find("shared/");
      shared.insert(records[i].substr(start, records[i].find('"', start) - start));
    }
  }
  EXPECT_EQ(shared, expected);
}

} // namespace
} // namespace orvane::testing
