// The record's time stamp from fixed instants, and PadNumber.
#include "logformat/timestamp.h"
#include "platform/platform.h"

#include <gtest/gtest.h>

namespace orvane {
namespace {

TEST(Timestamp, FormatsFixedInstantsInUtc) {
  struct Case {
    std::int64_t seconds;
    const char *text;
  };
  const Case cases[] = {
      {0, "1970-01-01T00:00:00"},
      {1700000000, "2023-11-14T22:13:20"},
      {1709622489, "2024-03-05T07:08:09"},       // single-digit fields padded
      {1703980799, "2023-12-30T23:59:59"},       // December is 12
      {1704067199, "2023-12-31T23:59:59"},       // last second of a year
      {1704067200, "2024-01-01T00:00:00"},       // first second of a year
      {951782400, "2000-02-29T00:00:00"},        // leap day of a century leap year
      {4107542400, "2100-03-01T00:00:00"},       // 2100 is not a leap year
      {-1, "1969-12-31T23:59:59"},               // before the epoch
      {253402300799, "9999-12-31T23:59:59"},     // the last four-digit year
      {253402300800, "10000-01-01T00:00:00"},    // a fifth digit is kept, not cut
  };
  for (const Case &c : cases) EXPECT_EQ(FormatTimestampAt(c.seconds), c.text) << c.seconds;
}

TEST(Timestamp, PadNumberFillsButNeverCuts) {
  struct Case {
    std::int64_t value;
    int width;
    const char *text;
  };
  const Case cases[] = {
      {7, 2, "07"}, {0, 2, "00"}, {2024, 4, "2024"}, {12345, 4, "12345"},
      {59, 2, "59"}, {5, 4, "0005"}, {-5, 4, "00-5"}, {3, 0, "3"},
  };
  for (const Case &c : cases) EXPECT_EQ(PadNumber(c.value, c.width), c.text) << c.value;
}

std::int64_t g_now = 0;
std::int64_t FakeNow() { return g_now; }

// The cache formats once per second and follows the clock when it moves.
TEST(Timestamp, CacheFollowsTheClock) {
  platform::calls().now_seconds = FakeNow;
  TimestampCache cache;
  const std::pair<std::int64_t, const char *> steps[] = {
      {1700000000, "2023-11-14T22:13:20"},
      {1700000000, "2023-11-14T22:13:20"},
      {1700000001, "2023-11-14T22:13:21"},
      {1699999999, "2023-11-14T22:13:19"}, // a clock set back is followed too
  };
  for (const auto &[now, text] : steps) {
    g_now = now;
    EXPECT_EQ(cache.Now(), text);
    EXPECT_EQ(FormatTimestamp(), text);
  }
  platform::calls() = platform::native_calls();
}

} // namespace
} // namespace orvane
